// The Java class android.DVB.Subttl.
#include <DVB.h>
#include <android_runtime/AndroidRuntime.h>
#include <nativehelper/JNIHelp.h>
#include <nativehelper/jni_macros.h>

#include "Fields.h"
#include "Module.h"
#include "Registration.h"
#include "Text.h"

using android::DVB;
using android::sp;
using android::Subttl;

namespace {

jfieldID gContext;          // Subttl.mNativeContext
dvbjni::StaticMutex sLock;  // created and destroyed with the library; never locked

// The subttl module of the DVB object that thiz is bound to, or null.
[[maybe_unused]] sp<Subttl> getSubttl(JNIEnv* env, jobject thiz) {
    jint context;
    return dvbjni::moduleOf(dvbjni::boundDvb(env, thiz, gContext, &context), &DVB::mSubttl);
}

const JNINativeMethod* const gMethods = nullptr;
constexpr int kMethodCount = 0;

}  // namespace

int register_android_dvb_Subttl(JNIEnv* env) {
    if (!dvbjni::findContextField(env, "android/DVB/Subttl", "Can't find android/DVB/Subttl",
                                  "Can't find Tuner.mNativeContext", &gContext)) {
        return -1;
    }
    return android::AndroidRuntime::registerNativeMethods(env, "android/DVB/Subttl", gMethods,
                                                          kMethodCount);
}
