// The Java class android.DVB.Teltxt.
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
using android::Teltxt;

namespace {

jfieldID gContext;          // Teltxt.mNativeContext
dvbjni::StaticMutex sLock;  // created and destroyed with the library; never locked

// The teltxt module of the DVB object that thiz is bound to, or null.
[[maybe_unused]] sp<Teltxt> getTeltxt(JNIEnv* env, jobject thiz) {
    jint context;
    return dvbjni::moduleOf(dvbjni::boundDvb(env, thiz, gContext, &context), &DVB::mTeltxt);
}

const JNINativeMethod* const gMethods = nullptr;
constexpr int kMethodCount = 0;

}  // namespace

int register_android_dvb_Teltxt(JNIEnv* env) {
    if (!dvbjni::findContextField(env, "android/DVB/Teltxt", "Can't find android/DVB/Teltxt",
                                  "Can't find Tuner.mNativeContext", &gContext)) {
        return -1;
    }
    return android::AndroidRuntime::registerNativeMethods(env, "android/DVB/Teltxt", gMethods,
                                                          kMethodCount);
}
