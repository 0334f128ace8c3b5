// The generic record writer: any bytes as a module-written record through writeRecord, with
// a map that uses every conversion toward Java. No module map of the library sends text the
// other way yet, so the map is the fuzzer's own; the modules' real maps are fuzzed through
// their natives in fuzz_lists and fuzz_subttl. The record is a heap block of exactly its
// size, so a read past it is caught; each Java value must be what the record holds.
#include <cstring>
#include <iterator>
#include <memory>

#include "FakeJni.h"
#include "Fields.h"
#include "TextReference.h"

namespace {

struct Sample {
    int32_t i32;
    uint8_t u8;
    uint8_t gap5;
    uint16_t u16;
    int16_t i16;
    uint8_t gap10[2];
    uint32_t u32;
    int64_t i64;
    char text[16];
    char textOrNull[8];
    char lang[4];
    char bytes[64];
    char all[32];
    char one[1];
    char wide[4100];  // wider than the library reads text
};

constexpr const char* kClass = "fuzz/Sample";

const dvbjni::JavaField kSampleFields[] = {
        JF_INT(Sample, i32, "i32"),
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
        JF_TEXT(Sample, wide, "wide", Text),
};

fakejni::Env& env() {
    return fakejni::env();
}

void expectInt(jobject out, const char* name, jint want) {
    const fakejni::Value* v = env().value(out, name);
    FUZZ_CHECK(v != nullptr && v->type == 'I' && v->i == want);
}

void expectLong(jobject out, const char* name, jlong want) {
    const fakejni::Value* v = env().value(out, name);
    FUZZ_CHECK(v != nullptr && v->type == 'J' && v->j == want);
}

void expectString(jobject out, const char* name, const char* field, size_t width) {
    const fakejni::Value* v = env().value(out, name);
    FUZZ_CHECK(v != nullptr && v->type == 'L' && v->object != nullptr);
    FUZZ_CHECK(v->object->kind == fakejni::Kind::String);
    FUZZ_CHECK(v->object->chars ==
               fuzzref::expectedText(reinterpret_cast<const uint8_t*>(field), width).chars);
}

// A byte array of the field's first `length` bytes, copied from the field itself.
void expectBytes(jobject out, const char* name, const char* field, size_t length) {
    const fakejni::Value* v = env().value(out, name);
    FUZZ_CHECK(v != nullptr && v->type == 'L' && v->object != nullptr);
    FUZZ_CHECK(v->object->kind == fakejni::Kind::ByteArray);
    FUZZ_CHECK(v->object->bytes.size() == length);
    FUZZ_CHECK(length == 0 || memcmp(v->object->bytes.data(), field, length) == 0);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    if (size == 0) return 0;
    env().reset();

    // The input fills the record from its start; a longer record is filled on with the first
    // input byte, so that long unended text costs the fuzzer one byte.
    std::unique_ptr<Sample> rec(new Sample);
    auto* raw = reinterpret_cast<uint8_t*>(rec.get());
    size_t n = size < sizeof(Sample) ? size : sizeof(Sample);
    memcpy(raw, data, n);
    memset(raw + n, data[0], sizeof(Sample) - n);
    env().setTextWindow(rec.get(), sizeof(Sample));

    jobject out = env().newInstance(kClass);
    dvbjni::FieldIds ids;
    FUZZ_CHECK(ids.lookup(env().get(), kClass, kSampleFields));
    FUZZ_CHECK(dvbjni::writeRecord(env().get(), out, kSampleFields, ids, std::size(kSampleFields),
                                   rec.get()));
    FUZZ_CHECK(!env().pending());
    FUZZ_CHECK(env().setCount(out) == std::size(kSampleFields));

    const Sample& r = *rec;
    expectInt(out, "i32", r.i32);
    expectInt(out, "u8", r.u8);  // zero-extended
    expectInt(out, "u16", r.u16);
    expectInt(out, "i16", r.i16);  // sign-extended
    expectLong(out, "u32", static_cast<jlong>(r.u32));
    expectLong(out, "i64", r.i64);
    expectString(out, "text", r.text, sizeof r.text);
    if (r.textOrNull[0] == '\0') {
        const fakejni::Value* v = env().value(out, "textOrNull");
        FUZZ_CHECK(v != nullptr && v->type == 'L' && v->object == nullptr);
    } else {
        expectString(out, "textOrNull", r.textOrNull, sizeof r.textOrNull);
    }
    expectString(out, "lang", r.lang, sizeof r.lang);
    expectBytes(out, "bytes", r.bytes, strnlen(r.bytes, sizeof r.bytes));
    expectBytes(out, "all", r.all, sizeof r.all);
    expectString(out, "one", r.one, sizeof r.one);
    expectString(out, "wide", r.wide, sizeof r.wide);

    // Every byte-array copy came from inside its own field.
    for (const fakejni::Copy& c : env().copies()) {
        const char* from = static_cast<const char*>(c.source);
        bool inBytes = from >= r.bytes && from + c.bytes <= r.bytes + sizeof r.bytes;
        bool inAll = from >= r.all && from + c.bytes <= r.all + sizeof r.all;
        FUZZ_CHECK(inBytes || inAll);
    }
    return 0;
}
