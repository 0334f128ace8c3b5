#include "Registration.h"

#include <nativehelper/scoped_local_ref.h>

#include "Errors.h"

namespace dvbjni {

bool findContextField(JNIEnv* env, const char* className, const char* classMessage,
                      const char* fieldMessage, jfieldID* contextField) {
    ScopedLocalRef<jclass> cls(env, env->FindClass(className));
    if (cls.get() == nullptr) {
        throwRuntime(env, classMessage);
        return false;
    }
    *contextField = env->GetFieldID(cls.get(), "mNativeContext", "I");
    if (*contextField == nullptr) {
        throwRuntime(env, fieldMessage);
        return false;
    }
    return true;
}

}  // namespace dvbjni
