// The Java class android.DVB.DVB: library entry, the binding of an android::DVB service
// object to each Java DVB object, and the listener that forwards the service's events.
#include <DVB.h>
#include <android/log.h>
#include <android_runtime/AndroidRuntime.h>
#include <nativehelper/JNIHelp.h>
#include <nativehelper/jni_macros.h>
#include <nativehelper/scoped_local_ref.h>

#include "Context.h"
#include "Module.h"
#include "Registration.h"

using android::DVB;
using android::sp;

namespace {

constexpr const char* kTag = "DVB";

struct {
    jfieldID context;
    jmethodID postEvent;
} gFields;

// Guards the exchange of DVB.mNativeContext.
dvbjni::StaticMutex sLock;

// The environment of the calling thread. A thread that the Java VM does not know is attached
// for the length of the scope and detached after, so that no event is lost and no global
// reference leaks when the service calls from a thread of its own.
class ThreadEnv {
public:
    ThreadEnv() : mEnv(android::AndroidRuntime::getJNIEnv()), mAttached(false) {
        if (mEnv != nullptr) return;
        JavaVM* vm = android::AndroidRuntime::getJavaVM();
        if (vm != nullptr && vm->AttachCurrentThread(&mEnv, nullptr) == JNI_OK) {
            mAttached = true;
        } else {
            mEnv = nullptr;
        }
    }
    ~ThreadEnv() {
        if (mAttached) android::AndroidRuntime::getJavaVM()->DetachCurrentThread();
    }
    ThreadEnv(const ThreadEnv&) = delete;
    ThreadEnv& operator=(const ThreadEnv&) = delete;
    JNIEnv* get() const { return mEnv; }

private:
    JNIEnv* mEnv;
    bool mAttached;
};

}  // namespace

// Forwards the service's events to DVB.postEventFromNative with the event target that
// native_setup was given.
class DVB_EXPORT JNIDVBListener : public android::DVBListener {
public:
    JNIDVBListener(JNIEnv* env, jobject thiz, jobject eventTarget);
    ~JNIDVBListener() override;
    void notify(int msg, int ext1, int ext2, const android::Parcel* obj) override;

private:
    JNIDVBListener(const JNIDVBListener&) = delete;
    JNIDVBListener& operator=(const JNIDVBListener&) = delete;

    jclass mClass;
    jobject mObject;
};

JNIDVBListener::JNIDVBListener(JNIEnv* env, jobject thiz, jobject eventTarget)
    : mClass(nullptr), mObject(nullptr) {
    ScopedLocalRef<jclass> cls(env, env->GetObjectClass(thiz));
    if (cls.get() == nullptr) {
        __android_log_print(ANDROID_LOG_ERROR, kTag, "Can't find android/DVB/DVB");
        jniThrowException(env, "java/lang/Exception", nullptr);
        return;
    }
    mClass = static_cast<jclass>(env->NewGlobalRef(cls.get()));
    mObject = env->NewGlobalRef(eventTarget);
}

JNIDVBListener::~JNIDVBListener() {
    ThreadEnv env;
    if (env.get() == nullptr) return;
    env.get()->DeleteGlobalRef(mObject);
    env.get()->DeleteGlobalRef(mClass);
}

void JNIDVBListener::notify(int msg, int ext1, int ext2, const android::Parcel*) {
    ThreadEnv env;
    if (env.get() == nullptr || mClass == nullptr) return;
    // The parcel is never read: the last argument reaches Java as null.
    env.get()->CallStaticVoidMethod(mClass, gFields.postEvent, mObject, msg, ext1, ext2, nullptr);
    // An exception thrown by the Java side is not handled here; it stays pending on this
    // thread. Asking whether there is one marks it as seen, as the VM's checks require of
    // every call that can throw, and leaves it in place.
    env.get()->ExceptionCheck();
}

namespace {

// Stores `dvb` in thiz's mNativeContext and returns the object that was there before. The
// Java object holds one strong reference, with itself as the reference ID. `*bound` tells
// whether `dvb` got a context: only a 64-bit build can run out of them (4096 bound objects).
sp<DVB> setDVB(JNIEnv* env, jobject thiz, const sp<DVB>& dvb, bool* bound) {
    __android_log_print(ANDROID_LOG_VERBOSE, kTag, "setDVB was called");
    pthread_mutex_lock(sLock.get());
    sp<DVB> old = dvbjni::contextObject(env->GetIntField(thiz, gFields.context));
    jint context = 0;
    *bound = true;
    if (dvb != nullptr) {
        context = dvbjni::contextBind(dvb.get());
        *bound = context != 0;
        if (*bound) dvb->incStrong(thiz);
    }
    if (old != nullptr) {
        old->decStrong(thiz);
        dvbjni::contextRelease(old.get());
    }
    DVB* stored = *bound ? dvb.get() : nullptr;
    __android_log_print(ANDROID_LOG_VERBOSE, kTag, "setDVB dvb.get() %p", stored);
    env->SetIntField(thiz, gFields.context, context);
    __android_log_print(ANDROID_LOG_VERBOSE, kTag, "setDVB dvb obj was set to context %p", stored);
    pthread_mutex_unlock(sLock.get());
    return old;
}

void DVB_native_init(JNIEnv* env, jclass) {
    __android_log_print(ANDROID_LOG_VERBOSE, kTag, "android_dvb_DVB_native_init was called");
    ScopedLocalRef<jclass> cls(env, env->FindClass("android/DVB/DVB"));
    if (cls.get() == nullptr) {
        dvbjni::throwRuntime(env, "Can't find android/DVB/DVB");
        return;
    }
    gFields.context = env->GetFieldID(cls.get(), "mNativeContext", "I");
    if (gFields.context == nullptr) {
        dvbjni::throwRuntime(env, "Can't find DVB.mNativeContext");
        return;
    }
    gFields.postEvent = env->GetStaticMethodID(cls.get(), "postEventFromNative",
                                               "(Ljava/lang/Object;IIILjava/lang/Object;)V");
    if (gFields.postEvent == nullptr) {
        dvbjni::throwRuntime(env, "Can't find DVB.postEventFromNative");
    }
}

void DVB_native_setup(JNIEnv* env, jobject thiz, jobject eventTarget) {
    __android_log_print(ANDROID_LOG_VERBOSE, kTag, "android_dvb_DVB_native_setup was called");
    sp<DVB> dvb = new DVB();
    if (dvb == nullptr) {
        jniThrowException(env, "java/lang/RuntimeException", "Out of memory");
        return;
    }
    sp<JNIDVBListener> listener = new JNIDVBListener(env, thiz, eventTarget);
    dvb->setListener(listener);
    bool bound;
    setDVB(env, thiz, dvb, &bound);
    if (!bound) {
        // The refused object and its listener go first: their destructors call into the VM,
        // which takes no call while an exception is pending.
        dvb->setListener(nullptr);
        listener.clear();
        dvb.clear();
        jniThrowException(env, "java/lang/RuntimeException", "Out of memory");
    }
}

void DVB_native_release(JNIEnv* env, jobject thiz) {
    __android_log_print(ANDROID_LOG_VERBOSE, kTag, "android_dvb_DVB_release was called");
    bool bound;
    sp<DVB> old = setDVB(env, thiz, nullptr, &bound);
    if (old != nullptr) old->setListener(nullptr);
}

void DVB_native_finalize(JNIEnv* env, jobject thiz) {
    __android_log_print(ANDROID_LOG_VERBOSE, kTag, "android_dvb_DVB_native_finalize was called");
    DVB_native_release(env, thiz);
}

const JNINativeMethod gMethods[] = {
        MAKE_JNI_NATIVE_METHOD("native_init", "()V", DVB_native_init),
        MAKE_JNI_NATIVE_METHOD("native_setup", "(Ljava/lang/Object;)V", DVB_native_setup),
        MAKE_JNI_NATIVE_METHOD("native_finalize", "()V", DVB_native_finalize),
        MAKE_JNI_NATIVE_METHOD("native_release", "()V", DVB_native_release),
};

}  // namespace

jint JNI_OnLoad(JavaVM* vm, void* /* reserved */) {
    JNIEnv* env = nullptr;
    if (vm->GetEnv(reinterpret_cast<void**>(&env), JNI_VERSION_1_4) != JNI_OK) {
        __android_log_print(ANDROID_LOG_ERROR, kTag, "ERROR: GetEnv failed\n");
        return -1;
    }
    __android_log_print(ANDROID_LOG_VERBOSE, kTag, "register_android_dvb_DVB was called");
    bool ok = android::AndroidRuntime::registerNativeMethods(env, "android/DVB/DVB", gMethods,
                                                             NELEM(gMethods)) >= 0 &&
              register_android_dvb_Scnm(env) >= 0 && register_android_dvb_Strm(env) >= 0 &&
              register_android_dvb_Cfg(env) >= 0 && register_android_dvb_Subttl(env) >= 0 &&
              register_android_dvb_Teltxt(env) >= 0;
    if (!ok) {
        __android_log_print(ANDROID_LOG_ERROR, kTag, "ERROR: DVB native registration failed\n");
        return -1;
    }
    return JNI_VERSION_1_4;
}
