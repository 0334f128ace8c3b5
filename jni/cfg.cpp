// The Java class android.DVB.Cfg: tuning and front-end status, the dish positioner, audio
// and video output, and device services, on the configuration module.
#include <DVB.h>
#include <android_runtime/AndroidRuntime.h>
#include <nativehelper/JNIHelp.h>
#include <nativehelper/jni_macros.h>

#include "Fields.h"
#include "Frontend.h"
#include "Module.h"
#include "Registration.h"
#include "Text.h"

using android::Cfg;
using android::DVB;
using android::sp;
using dvbjni::requireModule;

namespace {

constexpr const char* kTag = "CFG";

jfieldID gContext;          // Cfg.mNativeContext
dvbjni::StaticMutex sLock;  // created and destroyed with the library; never locked

// The configuration module of the DVB object that thiz is bound to, or null.
sp<Cfg> getCfg(JNIEnv* env, jobject thiz) {
    jint context;
    DVB* dvb = dvbjni::boundDvb(env, thiz, gContext, &context);
    if (context == 0) {
        __android_log_print(ANDROID_LOG_DEBUG, kTag, "could not get the dvb obj from context");
        return nullptr;
    }
    return dvbjni::moduleOf(dvb, &DVB::mCfg);
}

constexpr const char* kFrontendClass = "android/DVB/Cfg$ANT_FrontendParameters";
constexpr const char* kStatusClass = "android/DVB/Cfg$ANT_Status";
constexpr const char* kVideoPositionClass = "android/DVB/Cfg$Video_Position";
constexpr const char* kCaStatusClass = "android/DVB/Cfg$CA_Status";

// The offset-8 status word stays out of Java.
const dvbjni::JavaField kStatusFields[] = {
        JF_INT(ANT_Status, feStatus, "feStatus"),
        JF_INT(ANT_Status, strength, "strength"),
        JF_INT(ANT_Status, quality, "quality"),
};

const dvbjni::JavaField kVideoPositionFields[] = {
        JF_INT(Video_Position, x, "x"),
        JF_INT(Video_Position, y, "y"),
        JF_INT(Video_Position, w, "w"),
        JF_INT(Video_Position, h, "h"),
};

// The two values that Cfg::CaGetStatus writes, `source` first; Java receives `lastCwSet` first.
struct CaValues {
    int32_t source;
    int32_t lastCwSet;
};

const dvbjni::JavaField kCaStatusFields[] = {
        JF_INT(CaValues, lastCwSet, "lastCwSet"),
        JF_INT(CaValues, source, "source"),
};

// ---- tuning and front-end status ---------------------------------------------------------

jint tune(JNIEnv* env, jobject thiz, jint dev, jobject params, bool tryOnly) {
    sp<Cfg> cfg = requireModule(env, getCfg(env, thiz));
    if (cfg == nullptr) return -1;
    ANT_FrontendParameters rec{};
    if (!dvbjni::readFrontend(env, params, kFrontendClass, &rec)) return -1;
    return tryOnly ? cfg->TryTune(dev, &rec) : cfg->Tune(dev, &rec);
}

jint Cfg_TryTune(JNIEnv* env, jobject thiz, jint dev, jobject params) {
    return tune(env, thiz, dev, params, true);
}

jint Cfg_Tune(JNIEnv* env, jobject thiz, jint dev, jobject params) {
    return tune(env, thiz, dev, params, false);
}

// Returns 0 whatever the module answered; the Java object gets what it wrote, or zeros.
jint Cfg_GetStatus(JNIEnv* env, jobject thiz, jint dev, jobject status) {
    sp<Cfg> cfg = requireModule(env, getCfg(env, thiz));
    if (cfg == nullptr || !dvbjni::requireObject(env, status, kStatusClass)) return -1;
    ANT_Status rec{};
    cfg->GetStatus(dev, &rec);
    return dvbjni::writeFields(env, status, kStatusClass, kStatusFields, &rec) ? 0 : -1;
}

// ---- dish positioner: the module's result is the Java result -----------------------------

jint Cfg_Reset(JNIEnv* env, jobject thiz, jint dev) {
    __android_log_print(ANDROID_LOG_VERBOSE, kTag, "android_dvb_Cfg_Reset was called");
    sp<Cfg> cfg = requireModule(env, getCfg(env, thiz));
    return cfg == nullptr ? -1 : cfg->Reset(dev);
}

jint Cfg_GotoPosition(JNIEnv* env, jobject thiz, jint dev, jint position) {
    sp<Cfg> cfg = requireModule(env, getCfg(env, thiz));
    return cfg == nullptr ? -1 : cfg->GotoPosition(dev, static_cast<uint8_t>(position));
}

jint Cfg_StorePosition(JNIEnv* env, jobject thiz, jint dev, jint position) {
    sp<Cfg> cfg = requireModule(env, getCfg(env, thiz));
    return cfg == nullptr ? -1 : cfg->StorePosition(dev, static_cast<uint8_t>(position));
}

jint Cfg_Recalculate(JNIEnv* env, jobject thiz, jint dev, jint position) {
    sp<Cfg> cfg = requireModule(env, getCfg(env, thiz));
    return cfg == nullptr ? -1 : cfg->Recalculate(dev, static_cast<uint8_t>(position));
}

jint Cfg_Drive(JNIEnv* env, jobject thiz, jint dev, jint a, jint b, jint c) {
    sp<Cfg> cfg = requireModule(env, getCfg(env, thiz));
    if (cfg == nullptr) return -1;
    return cfg->Drive(dev, static_cast<uint8_t>(a), static_cast<uint8_t>(b),
                      static_cast<uint8_t>(c));
}

jint Cfg_Stop(JNIEnv* env, jobject thiz, jint dev) {
    sp<Cfg> cfg = requireModule(env, getCfg(env, thiz));
    return cfg == nullptr ? -1 : cfg->Stop(dev);
}

jint Cfg_SetLimit(JNIEnv* env, jobject thiz, jint dev, jint limit) {
    sp<Cfg> cfg = requireModule(env, getCfg(env, thiz));
    return cfg == nullptr ? -1 : cfg->SetLimit(dev, static_cast<uint8_t>(limit));
}

jint Cfg_DisableLimit(JNIEnv* env, jobject thiz, jint dev) {
    sp<Cfg> cfg = requireModule(env, getCfg(env, thiz));
    return cfg == nullptr ? -1 : cfg->DisableLimit(dev);
}

jint Cfg_EnableLimit(JNIEnv* env, jobject thiz, jint dev) {
    sp<Cfg> cfg = requireModule(env, getCfg(env, thiz));
    return cfg == nullptr ? -1 : cfg->EnableLimit(dev);
}

jint Cfg_GotoSatellite(JNIEnv* env, jobject thiz, jint dev, jint a, jint b, jint c) {
    sp<Cfg> cfg = requireModule(env, getCfg(env, thiz));
    if (cfg == nullptr) return -1;
    return cfg->GotoSatellite(dev, static_cast<int16_t>(a), static_cast<int16_t>(b),
                              static_cast<int16_t>(c));
}

// ---- audio and video output --------------------------------------------------------------

jint Cfg_SetMuteAudio(JNIEnv* env, jobject thiz, jint dev, jint mute) {
    sp<Cfg> cfg = requireModule(env, getCfg(env, thiz));
    return cfg == nullptr ? -1 : cfg->SetMuteAudio(dev, static_cast<uint8_t>(mute));
}

jint Cfg_SetAudioVolume(JNIEnv* env, jobject thiz, jint volume) {
    sp<Cfg> cfg = requireModule(env, getCfg(env, thiz));
    return cfg == nullptr ? -1 : cfg->SetAudioVolume(volume);
}

jint Cfg_SetMuteVideo(JNIEnv* env, jobject thiz, jint dev, jint mute) {
    sp<Cfg> cfg = requireModule(env, getCfg(env, thiz));
    return cfg == nullptr ? -1 : cfg->SetMuteVideo(dev, static_cast<uint8_t>(mute));
}

jint Cfg_SetVideoPos(JNIEnv* env, jobject thiz, jint dev, jobject position) {
    sp<Cfg> cfg = requireModule(env, getCfg(env, thiz));
    if (cfg == nullptr) return -1;
    Video_Position rec{};
    if (!dvbjni::readFields(env, position, kVideoPositionClass, kVideoPositionFields, &rec)) {
        return -1;
    }
    return cfg->SetVideoPos(dev, &rec);
}

// Returns 0 whatever the module answered. Cfg::GetVideoPos sits late in the module's order,
// after Cfg::TSDumpStop, not beside Cfg::SetVideoPos.
jint Cfg_GetVideoPos(JNIEnv* env, jobject thiz, jint dev, jobject position) {
    sp<Cfg> cfg = requireModule(env, getCfg(env, thiz));
    if (cfg == nullptr || !dvbjni::requireObject(env, position, kVideoPositionClass)) return -1;
    dvbjni::FieldIds ids;
    if (!ids.lookup(env, kVideoPositionClass, kVideoPositionFields)) return -1;
    Video_Position rec{};
    cfg->GetVideoPos(dev, &rec);
    return dvbjni::writeRecord(env, position, kVideoPositionFields, ids,
                               NELEM(kVideoPositionFields), &rec)
                   ? 0
                   : -1;
}

// ---- device services: 0 whenever the module is reachable ---------------------------------

jint Cfg_CaGetStatus(JNIEnv* env, jobject thiz, jint dev, jobject status) {
    sp<Cfg> cfg = requireModule(env, getCfg(env, thiz));
    if (cfg == nullptr || !dvbjni::requireObject(env, status, kCaStatusClass)) return -1;
    CaValues values{};
    cfg->CaGetStatus(dev, &values.source, &values.lastCwSet);
    return dvbjni::writeFields(env, status, kCaStatusClass, kCaStatusFields, &values) ? 0 : -1;
}

jint Cfg_CaStandby(JNIEnv* env, jobject thiz, jint dev) {
    sp<Cfg> cfg = requireModule(env, getCfg(env, thiz));
    if (cfg == nullptr) return -1;
    cfg->CaStandby(dev);
    return 0;
}

// Reaches no module operation; it only tells whether the module is there.
jint Cfg_GpioGet(JNIEnv* env, jobject thiz, jint /* line */) {
    sp<Cfg> cfg = requireModule(env, getCfg(env, thiz));
    return cfg == nullptr ? -1 : 0;
}

jint Cfg_GpioSet(JNIEnv* env, jobject thiz, jint line, jint value) {
    sp<Cfg> cfg = requireModule(env, getCfg(env, thiz));
    if (cfg == nullptr) return -1;
    cfg->GpioSet(line, value);
    return 0;
}

jint Cfg_SetWakeup(JNIEnv* env, jobject thiz, jint value) {
    sp<Cfg> cfg = requireModule(env, getCfg(env, thiz));
    if (cfg == nullptr) return -1;
    cfg->SetWakeup(value);
    return 0;
}

jint Cfg_BlindScanStart(JNIEnv* env, jobject thiz, jint dev, jint a, jint b, jint c, jint d) {
    sp<Cfg> cfg = requireModule(env, getCfg(env, thiz));
    if (cfg == nullptr) return -1;
    cfg->BlindScanStart(dev, a, b, c, d);
    return 0;
}

jint Cfg_BlindScanStop(JNIEnv* env, jobject thiz, jint dev) {
    sp<Cfg> cfg = requireModule(env, getCfg(env, thiz));
    if (cfg == nullptr) return -1;
    cfg->BlindScanStop(dev);
    return 0;
}

// The module gets a 256-byte buffer: the path cut after 255 bytes, always zero-ended.
jint Cfg_TSDumpStart(JNIEnv* env, jobject thiz, jint dev, jint a, jint b, jstring path) {
    sp<Cfg> cfg = requireModule(env, getCfg(env, thiz));
    if (cfg == nullptr) return -1;
    char buffer[kTSDumpPathSize] = {};
    if (dvbjni::copyStringBytes(env, path, buffer, sizeof buffer - 1, "path") < 0) return -1;
    cfg->TSDumpStart(dev, a, b, buffer);
    return 0;
}

jint Cfg_TSDumpStop(JNIEnv* env, jobject thiz) {
    sp<Cfg> cfg = requireModule(env, getCfg(env, thiz));
    if (cfg == nullptr) return -1;
    cfg->TSDumpStop();
    return 0;
}

const JNINativeMethod gMethods[] = {
        MAKE_JNI_NATIVE_METHOD("Cfg_Reset", "(I)I", Cfg_Reset),
        MAKE_JNI_NATIVE_METHOD("Cfg_GotoPosition", "(II)I", Cfg_GotoPosition),
        MAKE_JNI_NATIVE_METHOD("Cfg_StorePosition", "(II)I", Cfg_StorePosition),
        MAKE_JNI_NATIVE_METHOD("Cfg_Recalculate", "(II)I", Cfg_Recalculate),
        MAKE_JNI_NATIVE_METHOD("Cfg_Drive", "(IIII)I", Cfg_Drive),
        MAKE_JNI_NATIVE_METHOD("Cfg_Stop", "(I)I", Cfg_Stop),
        MAKE_JNI_NATIVE_METHOD("Cfg_SetLimit", "(II)I", Cfg_SetLimit),
        MAKE_JNI_NATIVE_METHOD("Cfg_DisableLimit", "(I)I", Cfg_DisableLimit),
        MAKE_JNI_NATIVE_METHOD("Cfg_EnableLimit", "(I)I", Cfg_EnableLimit),
        MAKE_JNI_NATIVE_METHOD("Cfg_GotoSatellite", "(IIII)I", Cfg_GotoSatellite),
        MAKE_JNI_NATIVE_METHOD("Cfg_TryTune", "(ILandroid/DVB/Cfg$ANT_FrontendParameters;)I",
                               Cfg_TryTune),
        MAKE_JNI_NATIVE_METHOD("Cfg_Tune", "(ILandroid/DVB/Cfg$ANT_FrontendParameters;)I",
                               Cfg_Tune),
        MAKE_JNI_NATIVE_METHOD("Cfg_GetStatus", "(ILandroid/DVB/Cfg$ANT_Status;)I", Cfg_GetStatus),
        MAKE_JNI_NATIVE_METHOD("Cfg_SetMuteAudio", "(II)I", Cfg_SetMuteAudio),
        MAKE_JNI_NATIVE_METHOD("Cfg_SetAudioVolume", "(I)I", Cfg_SetAudioVolume),
        MAKE_JNI_NATIVE_METHOD("Cfg_SetMuteVideo", "(II)I", Cfg_SetMuteVideo),
        MAKE_JNI_NATIVE_METHOD("Cfg_SetVideoPos", "(ILandroid/DVB/Cfg$Video_Position;)I",
                               Cfg_SetVideoPos),
        MAKE_JNI_NATIVE_METHOD("Cfg_GetVideoPos", "(ILandroid/DVB/Cfg$Video_Position;)I",
                               Cfg_GetVideoPos),
        MAKE_JNI_NATIVE_METHOD("Cfg_CaGetStatus", "(ILandroid/DVB/Cfg$CA_Status;)I",
                               Cfg_CaGetStatus),
        MAKE_JNI_NATIVE_METHOD("Cfg_CaStandby", "(I)I", Cfg_CaStandby),
        MAKE_JNI_NATIVE_METHOD("Cfg_GpioGet", "(I)I", Cfg_GpioGet),
        MAKE_JNI_NATIVE_METHOD("Cfg_GpioSet", "(II)I", Cfg_GpioSet),
        MAKE_JNI_NATIVE_METHOD("Cfg_SetWakeup", "(I)I", Cfg_SetWakeup),
        MAKE_JNI_NATIVE_METHOD("Cfg_BlindScanStart", "(IIIII)I", Cfg_BlindScanStart),
        MAKE_JNI_NATIVE_METHOD("Cfg_BlindScanStop", "(I)I", Cfg_BlindScanStop),
        MAKE_JNI_NATIVE_METHOD("Cfg_TSDumpStart", "(IIILjava/lang/String;)I", Cfg_TSDumpStart),
        MAKE_JNI_NATIVE_METHOD("Cfg_TSDumpStop", "()I", Cfg_TSDumpStop),
};
static_assert(NELEM(gMethods) == 27, "android.DVB.Cfg declares 27 natives");

}  // namespace

int register_android_dvb_Cfg(JNIEnv* env) {
    __android_log_print(ANDROID_LOG_VERBOSE, kTag, "register_android_dvb_Cfg was called");
    if (!dvbjni::findContextField(env, "android/DVB/Cfg", "Can't find android/DVB/Cfg",
                                  "Can't find cfg.mNativeContext", &gContext)) {
        __android_log_print(ANDROID_LOG_VERBOSE, kTag,
                            "register_android_dvb_Cfg failed, could not find the filed");
        return -1;
    }
    return android::AndroidRuntime::registerNativeMethods(env, "android/DVB/Cfg", gMethods,
                                                          NELEM(gMethods));
}
