// The Java class android.DVB.Teltxt: teletext decoders, page navigation and page data, on
// the teletext module.
#include <DVB.h>
#include <android_runtime/AndroidRuntime.h>
#include <nativehelper/JNIHelp.h>
#include <nativehelper/jni_macros.h>

#include <algorithm>
#include <cstdio>
#include <memory>
#include <new>

#include "Fields.h"
#include "Module.h"
#include "Registration.h"
#include "Text.h"

using android::DVB;
using android::sp;
using android::Teltxt;
using dvbjni::requireModule;

namespace {

jfieldID gContext;          // Teltxt.mNativeContext
dvbjni::StaticMutex sLock;  // created and destroyed with the library; never locked

// The teltxt module of the DVB object that thiz is bound to, or null.
sp<Teltxt> getTeltxt(JNIEnv* env, jobject thiz) {
    jint context;
    return dvbjni::moduleOf(dvbjni::boundDvb(env, thiz, gContext, &context), &DVB::mTeltxt);
}

constexpr const char* kSettingsClass = "android/DVB/Teltxt$TELTXT_Settings";
constexpr const char* kNavPagesClass = "android/DVB/Teltxt$TELTXT_NavPages";

// Both strings fill their fields from the first byte with no terminator of their own: a
// 4-byte langCode or a 32-byte streamName leaves no zero, a longer one is cut.
const dvbjni::JavaField kSettingsFields[] = {
        JF_INT(TELTXT_Settings, devId, "devId"),
        JF_INT(TELTXT_Settings, pid, "pid"),
        JF_INT(TELTXT_Settings, type, "type"),
        JF_TEXT(TELTXT_Settings, langCode, "langCode", Text),
        JF_INT(TELTXT_Settings, magazineNumber, "magazineNumber"),
        JF_INT(TELTXT_Settings, pageNumber, "pageNumber"),
        JF_INT(TELTXT_Settings, componetTag, "componetTag"),
        JF_TEXT(TELTXT_Settings, streamName, "streamName", Text),
};

// The four values that Teltxt::SetData writes, in the order of its arguments.
struct NavValues {
    int32_t prev100;
    int32_t prev10;
    int32_t next10;
    int32_t next100;
};

const dvbjni::JavaField kNavPagesFields[] = {
        JF_INT(NavValues, prev100, "prev100"),
        JF_INT(NavValues, prev10, "prev10"),
        JF_INT(NavValues, next10, "next10"),
        JF_INT(NavValues, next100, "next100"),
};

// The module's handle widened with its sign, or -1.
jlong Teltxt_Start(JNIEnv* env, jobject thiz, jobject settings) {
    sp<Teltxt> teltxt = requireModule(env, getTeltxt(env, thiz));
    if (teltxt == nullptr) return -1;
    TELTXT_Settings rec{};
    if (!dvbjni::readFields(env, settings, kSettingsClass, kSettingsFields, &rec)) return -1;
    rec.pidCopy = rec.pid;
    return teltxt->Start(&rec);
}

// Returns 0 whatever the module answered.
jint Teltxt_Stop(JNIEnv* env, jobject thiz, jlong handle) {
    sp<Teltxt> teltxt = requireModule(env, getTeltxt(env, thiz));
    if (teltxt == nullptr) return -1;
    teltxt->Stop(dvbjni::lowHandle(handle));
    return 0;
}

// Java receives all four values even when the module fails; one it leaves alone stays 0.
jint Teltxt_SetData(JNIEnv* env, jobject thiz, jlong handle, jint a, jint b, jobject nav) {
    sp<Teltxt> teltxt = requireModule(env, getTeltxt(env, thiz));
    if (teltxt == nullptr || !dvbjni::requireObject(env, nav, kNavPagesClass)) return -1;
    dvbjni::FieldIds ids;
    if (!ids.lookup(env, kNavPagesClass, kNavPagesFields)) return -1;
    NavValues v{};
    jint result = teltxt->SetData(dvbjni::lowHandle(handle), a, b, &v.prev100, &v.prev10, &v.next10,
                                  &v.next100);
    dvbjni::writeRecord(env, nav, kNavPagesFields, ids, NELEM(kNavPagesFields), &v);
    return result;
}

// Stages `count` bytes of the decoder's data, always from its offset 0, and copies them into
// `data` from index `start` on. A region outside the array leaves the VM's
// ArrayIndexOutOfBoundsException pending and still returns 0.
jint Teltxt_GetData(JNIEnv* env, jobject thiz, jlong handle, jint start, jint count,
                    jbyteArray data) {
    sp<Teltxt> teltxt = requireModule(env, getTeltxt(env, thiz));
    if (teltxt == nullptr) return -1;
    if (data == nullptr) {
        dvbjni::throwNull(env, "data");
        return -1;
    }
    if (count < 0) {
        dvbjni::throwIllegalArgument(env, "count %d is negative", count);
        return -1;
    }
    if (count == 0) {
        // Nothing to fetch, but an empty region past the array's end is still refused.
        jbyte none = 0;
        env->SetByteArrayRegion(data, start, 0, &none);
        return 0;
    }
    std::unique_ptr<uint8_t[]> buffer(new (std::nothrow) uint8_t[count]);
    if (buffer == nullptr) {
        char msg[96];
        snprintf(msg, sizeof msg, "no room for %d bytes of teletext data", count);
        jniThrowException(env, "java/lang/OutOfMemoryError", msg);
        return -1;
    }
    const int32_t h = dvbjni::lowHandle(handle);
    // The module delivers at most kTeltxtChunk bytes per call; offset + n never passes count,
    // so the sum cannot overflow.
    for (int32_t offset = 0; offset < count;) {
        int32_t n = std::min(kTeltxtChunk, count - offset);
        teltxt->GetData(h, offset, n, buffer.get() + offset);
        offset += n;
    }
    env->SetByteArrayRegion(data, start, count, reinterpret_cast<const jbyte*>(buffer.get()));
    return 0;
}

const JNINativeMethod gMethods[] = {
        MAKE_JNI_NATIVE_METHOD("Teltxt_Start", "(Landroid/DVB/Teltxt$TELTXT_Settings;)J",
                               Teltxt_Start),
        MAKE_JNI_NATIVE_METHOD("Teltxt_Stop", "(J)I", Teltxt_Stop),
        MAKE_JNI_NATIVE_METHOD("Teltxt_SetData", "(JIILandroid/DVB/Teltxt$TELTXT_NavPages;)I",
                               Teltxt_SetData),
        MAKE_JNI_NATIVE_METHOD("Teltxt_GetData", "(JII[B)I", Teltxt_GetData),
};
static_assert(NELEM(gMethods) == 4, "android.DVB.Teltxt declares 4 natives");

}  // namespace

int register_android_dvb_Teltxt(JNIEnv* env) {
    if (!dvbjni::findContextField(env, "android/DVB/Teltxt", "Can't find android/DVB/Teltxt",
                                  "Can't find Tuner.mNativeContext", &gContext)) {
        return -1;
    }
    return android::AndroidRuntime::registerNativeMethods(env, "android/DVB/Teltxt", gMethods,
                                                          NELEM(gMethods));
}
