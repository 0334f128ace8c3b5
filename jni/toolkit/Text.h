// Text between native records and Java.
//
// Records hold text as bytes in fixed-width fields, zero-ended when shorter than the field.
// Toward Java, a field ends at its first zero byte or at its end, whichever comes first, and
// bytes that are not valid modified UTF-8 never reach NewStringUTF: each such byte becomes
// U+FFFD in the Java string. From Java, strings arrive as their modified UTF-8 bytes.
#pragma once

#include <nativehelper/jni.h>

#include <cstddef>
#include <cstdint>

namespace dvbjni {

// Length of the text in a field of `width` bytes: up to its first zero byte or its end.
inline size_t fieldLength(const char* field, size_t width) {
    size_t n = 0;
    while (n < width && field[n] != '\0') ++n;
    return n;
}

// True when bytes[0, length) are a well-formed modified UTF-8 string without zero bytes.
bool isModifiedUtf8(const char* bytes, size_t length);

// A Java string of the text in a field of `width` bytes (at most 4096); null with an
// OutOfMemoryError pending if the VM has no room.
jstring newStringFromField(JNIEnv* env, const char* field, size_t width);

// A Java byte array holding bytes[0, length).
jbyteArray newByteArray(JNIEnv* env, const void* bytes, size_t length);

// Java string to record field. The string's modified UTF-8 bytes go to `dst`, at most
// `limit` of them, with no terminator of their own: callers zero the record first. Returns
// the string's full length in bytes, or -1 with NullPointerException("<what> is null")
// pending for a null string.
int64_t copyStringBytes(JNIEnv* env, jstring s, char* dst, size_t limit, const char* what);

}  // namespace dvbjni
