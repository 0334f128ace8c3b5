// Module text through newStringFromField, fieldLength and isModifiedUtf8: any bytes, any field
// width. The field lives in a heap block of exactly its width, so a read past it is caught;
// the fake NewStringUTF aborts on text that is not well-formed modified UTF-8 or not ended
// inside the field; and the Java string must be the one the reference decoder gives.
#include <memory>

#include "FakeJni.h"
#include "Text.h"
#include "TextReference.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    if (size < 2) return 0;
    fakejni::Env& env = fakejni::env();
    env.reset();

    // Two bytes choose the width: with the top bit set, the field is the rest of the input;
    // otherwise it is up to 8191 bytes of the rest repeated, so that short inputs can make
    // fields wider than the 4096 bytes the library reads.
    const uint16_t choice = static_cast<uint16_t>(data[0] | data[1] << 8);
    const uint8_t* rest = data + 2;
    const size_t restSize = size - 2;
    const size_t width = (choice & 0x8000) != 0 ? restSize : (choice & 0x1FFF);
    std::unique_ptr<char[]> field(new char[width]);
    for (size_t i = 0; i < width; ++i) {
        field[i] = restSize != 0 ? static_cast<char>(rest[i % restSize]) : 'A';
    }
    env.setTextWindow(field.get(), width);

    const auto* bytes = reinterpret_cast<const uint8_t*>(field.get());
    const fuzzref::Text want = fuzzref::expectedText(bytes, width);
    size_t textLength = 0;  // up to the first zero byte or the field's end
    while (textLength < width && bytes[textLength] != 0) ++textLength;
    FUZZ_CHECK(dvbjni::fieldLength(field.get(), width) == textLength);
    FUZZ_CHECK(dvbjni::isModifiedUtf8(field.get(), want.length) == want.wellFormed);

    jstring s = dvbjni::newStringFromField(env.get(), field.get(), width);
    FUZZ_CHECK(!env.pending());
    const fakejni::Object* string = env.object(s);
    FUZZ_CHECK(string != nullptr && string->kind == fakejni::Kind::String);
    FUZZ_CHECK(string->chars == want.chars);
    return 0;
}
