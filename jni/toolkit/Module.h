// The module access frame shared by every module native method.
//
// A module getter reads the Java object's mNativeContext, resolves the DVB object, locks and
// releases its mLock once, and returns a strong reference to one module, which keeps the
// module alive for the rest of the call. No lock of the library is held while the module
// works.
#pragma once

#include <DVB.h>
#include <android/log.h>
#include <nativehelper/jni.h>
#include <pthread.h>

#include "Context.h"
#include "Errors.h"

namespace dvbjni {

// One of the library's per-file mutexes: created when the library is loaded, destroyed at
// process exit in reverse order of creation.
class StaticMutex {
public:
    StaticMutex() { pthread_mutex_init(&mMutex, nullptr); }
    ~StaticMutex() { pthread_mutex_destroy(&mMutex); }
    StaticMutex(const StaticMutex&) = delete;
    StaticMutex& operator=(const StaticMutex&) = delete;
    pthread_mutex_t* get() { return &mMutex; }

private:
    pthread_mutex_t mMutex;
};

// The DVB object that `thiz` is bound to, or null when its context is 0 (`context` gets the
// value read) or no longer resolves.
inline android::DVB* boundDvb(JNIEnv* env, jobject thiz, jfieldID contextField, jint* context) {
    *context = env->GetIntField(thiz, contextField);
    return *context == 0 ? nullptr : contextObject(*context);
}

// The module `member` of `dvb`, read after the object's lock has been taken and released.
template <typename M>
android::sp<M> moduleOf(android::DVB* dvb, android::sp<M> android::DVB::*member) {
    if (dvb == nullptr) return nullptr;
    pthread_mutex_lock(&dvb->mLock);
    pthread_mutex_unlock(&dvb->mLock);
    return dvb->*member;
}

// The frame's failure path: a getter's null result raises IllegalStateException with no
// message. Use as `auto cfg = requireModule(env, getCfg(env, thiz)); if (!cfg) return -1;`.
template <typename M>
android::sp<M> requireModule(JNIEnv* env, android::sp<M> module) {
    if (module == nullptr) throwNoModule(env);
    return module;
}

// Writes one of the library's fixed log lines.
inline void logLine(int priority, const char* tag, const char* text) {
    __android_log_print(priority, tag, "%s", text);
}

}  // namespace dvbjni
