// The Java class android.DVB.Cfg.
#include <DVB.h>
#include <android_runtime/AndroidRuntime.h>
#include <nativehelper/JNIHelp.h>
#include <nativehelper/jni_macros.h>

#include "Fields.h"
#include "Module.h"
#include "Registration.h"
#include "Text.h"

using android::Cfg;
using android::DVB;
using android::sp;

namespace {

jfieldID gContext;          // Cfg.mNativeContext
dvbjni::StaticMutex sLock;  // created and destroyed with the library; never locked

// The cfg module of the DVB object that thiz is bound to, or null.
[[maybe_unused]] sp<Cfg> getCfg(JNIEnv* env, jobject thiz) {
    jint context;
    return dvbjni::moduleOf(dvbjni::boundDvb(env, thiz, gContext, &context), &DVB::mCfg);
}

const JNINativeMethod* const gMethods = nullptr;
constexpr int kMethodCount = 0;

}  // namespace

int register_android_dvb_Cfg(JNIEnv* env) {
    __android_log_print(ANDROID_LOG_VERBOSE, "CFG", "register_android_dvb_Cfg was called");
    if (!dvbjni::findContextField(env, "android/DVB/Cfg", "Can't find android/DVB/Cfg",
                                  "Can't find cfg.mNativeContext", &gContext)) {
        __android_log_print(ANDROID_LOG_VERBOSE, "CFG",
                            "register_android_dvb_Cfg failed, could not find the filed");
        return -1;
    }
    return android::AndroidRuntime::registerNativeMethods(env, "android/DVB/Cfg", gMethods,
                                                          kMethodCount);
}
