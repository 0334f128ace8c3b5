// How the library reports misuse and bad input to Java. Every failure raises one Java
// exception through jniThrowException and makes the method return its failure value (-1);
// nothing is thrown over an exception that is already pending.
#pragma once

#include <nativehelper/jni.h>

#include <cstdint>

namespace dvbjni {

// Replaces the NoClassDefFoundError or NoSuchFieldError that a failed look-up at load or
// set-up left pending with the library's own RuntimeException (throwing over it would make
// the VM warn).
void throwRuntime(JNIEnv* env, const char* message);

// No DVB object bound, or it has no such module.
void throwNoModule(JNIEnv* env);

// A null argument object, array or string that a value is needed from. `what` names it, as
// in "ANT_FrontendParameters" or "STRM_OpenSettings.szPath".
void throwNull(JNIEnv* env, const char* what);

// An index outside a cache or buffer: "Index 100 out of bounds for length 100".
void throwIndex(JNIEnv* env, int64_t index, int64_t length);

// Returns true when 0 <= index < length; raises IndexOutOfBoundsException otherwise.
inline bool checkIndex(JNIEnv* env, jint index, jint length) {
    if (index >= 0 && index < length) return true;
    throwIndex(env, index, length);
    return false;
}

// A value that the record cannot carry, with a message saying why.
void throwIllegalArgument(JNIEnv* env, const char* format, ...)
        __attribute__((format(printf, 2, 3)));

// The module's 32-bit handle: the low 32 bits of the Java long.
inline int32_t lowHandle(jlong handle) {
    return static_cast<int32_t>(static_cast<uint32_t>(static_cast<uint64_t>(handle)));
}

}  // namespace dvbjni
