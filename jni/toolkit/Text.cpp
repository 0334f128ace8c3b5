#include "Text.h"

#include <nativehelper/JNIHelp.h>

#include <cstdint>
#include <cstring>

#include "Errors.h"

namespace dvbjni {

namespace {

bool isContinuation(uint8_t b) {
    return (b & 0xC0) == 0x80;
}

// Length of the well-formed modified UTF-8 sequence at bytes[i], or 0 if there is none.
size_t sequenceLength(const uint8_t* b, size_t i, size_t length) {
    uint8_t c = b[i];
    if (c < 0x80) return c != 0 ? 1 : 0;
    if ((c & 0xE0) == 0xC0) {
        if (i + 1 >= length || !isContinuation(b[i + 1])) return 0;
        // Two-byte forms below U+0080 are overlong, except C0 80, the encoding of U+0000.
        if (c < 0xC2 && !(c == 0xC0 && b[i + 1] == 0x80)) return 0;
        return 2;
    }
    if ((c & 0xF0) == 0xE0) {
        if (i + 2 >= length || !isContinuation(b[i + 1]) || !isContinuation(b[i + 2])) return 0;
        if (c == 0xE0 && b[i + 1] < 0xA0) return 0;  // overlong
        return 3;  // surrogates are allowed: supplementary characters travel as pairs
    }
    return 0;  // stray continuation byte, or a four-byte form, which modified UTF-8 has not
}

}  // namespace

bool isModifiedUtf8(const char* bytes, size_t length) {
    const auto* b = reinterpret_cast<const uint8_t*>(bytes);
    for (size_t i = 0; i < length;) {
        size_t n = sequenceLength(b, i, length);
        if (n == 0) return false;
        i += n;
    }
    return true;
}

jstring newStringFromField(JNIEnv* env, const char* field, size_t width) {
    constexpr size_t kMaxWidth = 4096;
    if (width > kMaxWidth) width = kMaxWidth;
    size_t length = fieldLength(field, width);
    if (isModifiedUtf8(field, length)) {
        if (length < width) return env->NewStringUTF(field);  // already zero-ended in place
        char copy[kMaxWidth + 1];
        memcpy(copy, field, length);
        copy[length] = '\0';
        return env->NewStringUTF(copy);
    }
    // Decode what is well formed and replace every other byte, as Java's own decoders do.
    jchar chars[kMaxWidth];
    jsize count = 0;
    const auto* b = reinterpret_cast<const uint8_t*>(field);
    for (size_t i = 0; i < length;) {
        size_t n = sequenceLength(b, i, length);
        switch (n) {
            case 1:
                chars[count++] = b[i];
                break;
            case 2:
                chars[count++] = static_cast<jchar>(((b[i] & 0x1F) << 6) | (b[i + 1] & 0x3F));
                break;
            case 3:
                chars[count++] = static_cast<jchar>(((b[i] & 0x0F) << 12) |
                                                    ((b[i + 1] & 0x3F) << 6) | (b[i + 2] & 0x3F));
                break;
            default:
                chars[count++] = 0xFFFD;
                n = 1;
                break;
        }
        i += n;
    }
    return env->NewString(chars, count);
}

jbyteArray newByteArray(JNIEnv* env, const void* bytes, size_t length) {
    // Every caller's length is bounded by a record field; a larger one is a defect that must
    // not be cut down to a Java size silently.
    if (length > static_cast<size_t>(INT32_MAX)) {
        jniThrowException(env, "java/lang/OutOfMemoryError", "byte array too large");
        return nullptr;
    }
    jbyteArray array = env->NewByteArray(static_cast<jsize>(length));
    if (array != nullptr && length != 0) {
        env->SetByteArrayRegion(array, 0, static_cast<jsize>(length),
                                static_cast<const jbyte*>(bytes));
    }
    return array;
}

int64_t copyStringBytes(JNIEnv* env, jstring s, char* dst, size_t limit, const char* what) {
    if (s == nullptr) {
        throwNull(env, what);
        return -1;
    }
    const char* chars = env->GetStringUTFChars(s, nullptr);
    if (chars == nullptr) return -1;  // OutOfMemoryError pending
    size_t length = strlen(chars);
    memcpy(dst, chars, length < limit ? length : limit);
    env->ReleaseStringUTFChars(s, chars);
    return static_cast<int64_t>(length);
}

}  // namespace dvbjni
