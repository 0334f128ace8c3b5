// Module text through newStringFromField, fieldLength and isModifiedUtf8: any bytes, any field
// width. The field is a heap block of exactly its width, so a read past it is caught; the fake
// NewStringUTF refuses text that is not modified UTF-8 or does not end inside the field; and
// the Java string must be the one the reference decoder gives.
#include "Harness.h"
#include "Text.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    if (size < 2) return 0;
    fuzz::reset(nullptr);
    // Two bytes choose the width: with the top bit set, the field is the rest of the input;
    // otherwise up to 8191 bytes of the rest repeated, so that short inputs make fields wider
    // than the 4096 bytes the library reads.
    const uint16_t choice = static_cast<uint16_t>(data[0] | data[1] << 8);
    const size_t rest = size - 2;
    const size_t width = (choice & 0x8000) != 0 ? rest : (choice & 0x1FFF);
    std::unique_ptr<char[]> field(new char[width]);
    for (size_t i = 0; i < width; ++i) field[i] = rest != 0 ? data[2 + i % rest] : 'A';

    const auto* bytes = reinterpret_cast<const uint8_t*>(field.get());
    const fuzz::Text want = fuzz::expectedText(bytes, width);
    size_t length = 0;  // up to the first zero byte or the field's end
    while (length < width && bytes[length] != 0) ++length;
    FUZZ_CHECK(dvbjni::fieldLength(field.get(), width) == length);
    FUZZ_CHECK(dvbjni::isModifiedUtf8(field.get(), want.length) == want.wellFormed);

    jstring s = dvbjni::newStringFromField(fuzz::jni(), field.get(), width);
    FUZZ_CHECK(fuzz::now.thrown.empty() && fuzz::live(s, fuzz::Kind::String)->chars == want.chars);
    return 0;
}
