// The Java class android.DVB.Scnm.
#include <DVB.h>
#include <android_runtime/AndroidRuntime.h>
#include <nativehelper/JNIHelp.h>
#include <nativehelper/jni_macros.h>

#include "Fields.h"
#include "Module.h"
#include "Registration.h"
#include "Text.h"

using android::DVB;
using android::Scnm;
using android::sp;

namespace {

jfieldID gContext;          // Scnm.mNativeContext
dvbjni::StaticMutex sLock;  // created and destroyed with the library; never locked

// The scnm module of the DVB object that thiz is bound to, or null.
[[maybe_unused]] sp<Scnm> getScnm(JNIEnv* env, jobject thiz) {
    jint context;
    return dvbjni::moduleOf(dvbjni::boundDvb(env, thiz, gContext, &context), &DVB::mScnm);
}

const JNINativeMethod* const gMethods = nullptr;
constexpr int kMethodCount = 0;

}  // namespace

int register_android_dvb_Scnm(JNIEnv* env) {
    if (!dvbjni::findContextField(env, "android/DVB/Scnm", "Can't find android/DVB/Scnm",
                                  "Can't find Tuner.mNativeContext", &gContext)) {
        __android_log_print(ANDROID_LOG_VERBOSE, "SCNM",
                            "register_android_dvb_Scnm failed, could not find the filed");
        return -1;
    }
    return android::AndroidRuntime::registerNativeMethods(env, "android/DVB/Scnm", gMethods,
                                                          kMethodCount);
}
