// The generic record writer: any bytes as a module-written record through writeRecord, with a
// map that uses every conversion toward Java (no module map sends text that way yet, so the map
// is the fuzzer's own; the modules' maps are fuzzed through their natives). The record is a
// heap block of exactly its size; each Java value must be what the record holds.
#include <iterator>

#include "Fields.h"
#include "Harness.h"

namespace {

struct Sample {
    int32_t i32;
    uint8_t u8, gap5;
    uint16_t u16;
    int16_t i16;
    uint8_t gap10[2];
    uint32_t u32;
    int64_t i64;
    char text[16], textOrNull[8], lang[4], bytes[64], all[32], one[1];
    char wide[4100];  // wider than the library reads text
};

const dvbjni::JavaField kSampleFields[] = {JF_INT(Sample, i32, "i32"),
                                           JF_INT(Sample, u8, "u8"),
                                           JF_INT(Sample, u16, "u16"),
                                           JF_INT(Sample, i16, "i16"),
                                           JF_LONG(Sample, u32, "u32"),
                                           JF_LONG(Sample, i64, "i64"),
                                           JF_TEXT(Sample, text, "text", Text),
                                           JF_TEXT(Sample, textOrNull, "textOrNull", TextOrNull),
                                           JF_TEXT(Sample, lang, "lang", LangCode),
                                           JF_TEXT(Sample, bytes, "bytes", Bytes),
                                           JF_TEXT(Sample, all, "all", AllBytes),
                                           JF_TEXT(Sample, one, "one", Text),
                                           JF_TEXT(Sample, wide, "wide", Text)};

// The oracle's view of the same members, and how the map above sends them.
DVB_RECORD_FIELD(Sample, i32, 0);
DVB_RECORD_FIELD(Sample, u8, 4);
DVB_RECORD_FIELD(Sample, u16, 6);
DVB_RECORD_FIELD(Sample, i16, 8);
DVB_RECORD_FIELD(Sample, u32, 12);
DVB_RECORD_FIELD(Sample, i64, 16);
DVB_RECORD_FIELD(Sample, text, 24);
DVB_RECORD_FIELD(Sample, textOrNull, 40);
DVB_RECORD_FIELD(Sample, lang, 48);
DVB_RECORD_FIELD(Sample, bytes, 52);
DVB_RECORD_FIELD(Sample, all, 116);
DVB_RECORD_FIELD(Sample, one, 148);
DVB_RECORD_FIELD(Sample, wide, 149);
const fuzz::Mapping kMapping{{{"Sample", 13}}, {}, {}, {"Sample.textOrNull"}, {"Sample.all"}};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    if (size == 0) return 0;
    fuzz::reset(nullptr);
    // The input fills the record from its start; a longer record is filled on with the first
    // input byte, so that long unended text costs the fuzzer one byte.
    std::unique_ptr<Sample> rec(new Sample);
    const size_t n = std::min(size, sizeof(Sample));
    memcpy(rec.get(), data, n);
    memset(reinterpret_cast<uint8_t*>(rec.get()) + n, data[0], sizeof(Sample) - n);

    jobject out = fuzz::newObject("fuzz/Sample");
    dvbjni::FieldIds ids;
    FUZZ_CHECK(ids.lookup(fuzz::jni(), "fuzz/Sample", kSampleFields));
    FUZZ_CHECK(dvbjni::writeRecord(fuzz::jni(), out, kSampleFields, ids, std::size(kSampleFields),
                                   rec.get()));
    FUZZ_CHECK(fuzz::now.thrown.empty() && fuzz::live(out)->set.size() == 13);
    fuzz::expectFields(out, "Sample", rec.get(), rec.get(), kMapping);
    return 0;
}
