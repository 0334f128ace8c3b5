#include "Errors.h"

#include <nativehelper/JNIHelp.h>

#include <cinttypes>
#include <cstdarg>
#include <cstdio>

namespace dvbjni {

void throwRuntime(JNIEnv* env, const char* message) {
    env->ExceptionClear();
    jniThrowException(env, "java/lang/RuntimeException", message);
}

void throwNoModule(JNIEnv* env) {
    jniThrowException(env, "java/lang/IllegalStateException", nullptr);
}

void throwNull(JNIEnv* env, const char* what) {
    char msg[160];
    snprintf(msg, sizeof msg, "%s is null", what);
    jniThrowException(env, "java/lang/NullPointerException", msg);
}

void throwIndex(JNIEnv* env, int64_t index, int64_t length) {
    char msg[96];
    snprintf(msg, sizeof msg, "Index %" PRId64 " out of bounds for length %" PRId64, index, length);
    jniThrowException(env, "java/lang/IndexOutOfBoundsException", msg);
}

void throwIllegalArgument(JNIEnv* env, const char* format, ...) {
    char msg[200];
    va_list args;
    va_start(args, format);
    vsnprintf(msg, sizeof msg, format, args);
    va_end(args);
    jniThrowException(env, "java/lang/IllegalArgumentException", msg);
}

}  // namespace dvbjni
