// The Java class android.DVB.Scnm: channel search on the scan module, the services and
// networks it finds, and start-up and shut-down of the DVB system.
#include <DVB.h>
#include <android_runtime/AndroidRuntime.h>
#include <nativehelper/JNIHelp.h>
#include <nativehelper/jni_macros.h>
#include <nativehelper/scoped_local_ref.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstring>

#include "Fields.h"
#include "Frontend.h"
#include "Module.h"
#include "Registration.h"
#include "Text.h"

// The event database that the service creates while the system starts.
#ifndef DVB_EPG_DB_PATH
#define DVB_EPG_DB_PATH "/mnt/epg.db"
#endif

using android::DVB;
using android::Scnm;
using android::sp;
using dvbjni::lowHandle;

// The results of the last searches, whole nodes as the module handed them over, read back one
// entry at a time. Exported by name; shared by every Scnm object of the process.
DVB_EXPORT SCNM_ServiceInfo s_SvcExt[100];
DVB_EXPORT SCNMNET_FrontEndSettings s_SvcNet[200];

namespace {

constexpr const char* kTag = "SCNM";

// Each group of methods writes its own line when the module is out of reach; the list and
// system methods share one whose text names no method of theirs.
constexpr const char* kControlFailure =
        "android_dvb_Scnm_Init,could not get the dvb obj from context";
constexpr const char* kResultFailure =
        "android_dvb_Tuner_StartAVPlay,could not get the dvb obj from context";

jfieldID gContext;          // Scnm.mNativeContext
dvbjni::StaticMutex sLock;  // created and destroyed with the library; never locked

// The scan module of the DVB object that thiz is bound to, or null.
sp<Scnm> getScnm(JNIEnv* env, jobject thiz) {
    dvbjni::logLine(ANDROID_LOG_VERBOSE, kTag, "getScnm was called");
    jint context;
    DVB* dvb = dvbjni::boundDvb(env, thiz, gContext, &context);
    if (context == 0) {
        dvbjni::logLine(ANDROID_LOG_VERBOSE, kTag, "could not get the dvb obj from context");
        return nullptr;
    }
    return dvbjni::moduleOf(dvb, &DVB::mScnm);
}

// The module access frame: the scan module, or null with IllegalStateException raised and the
// method's `failureLine` written.
sp<Scnm> requireScnm(JNIEnv* env, jobject thiz, const char* failureLine) {
    sp<Scnm> scnm = dvbjni::requireModule(env, getScnm(env, thiz));
    if (scnm == nullptr) dvbjni::logLine(ANDROID_LOG_VERBOSE, kTag, failureLine);
    return scnm;
}

constexpr const char* kOpenClass = "android/DVB/Scnm$SCNM_OpenSettings";
constexpr const char* kStartClass = "android/DVB/Scnm$SCNM_StartSettings";
constexpr const char* kStatusClass = "android/DVB/Scnm$SCNM_GetStatus";
constexpr const char* kServiceClass = "android/DVB/Scnm$SCNM_ServiceInfo";
constexpr const char* kNetworkClass = "android/DVB/Scnm$SCNMNET_FrontEndSettings";
constexpr const char* kConfigClass = "android/DVB/Scnm$DVB_Config";

const dvbjni::JavaField kOpenFields[] = {
        JF_INT(SCNM_OpenSettings, frontend, "frontend"),
        JF_INT(SCNM_OpenSettings, demux, "demux"),
};

// The scan's own fields after the front-end block; a null langCode leaves the default "eng".
const dvbjni::JavaField kStartFields[] = {
        JF_INT(SCNM_StartSettings, scanType, "scanType"),
        JF_INT(SCNM_StartSettings, scanNetwrok, "scanNetwrok"),
        JF_TEXT(SCNM_StartSettings, langCode, "langCode", LangCodeOr),
};

const dvbjni::JavaField kStatusFields[] = {
        JF_INT(SCNM_GetStatus, feStatus, "feStatus"),
        JF_INT(SCNM_GetStatus, sfStatus, "sfStatus"),
        JF_INT(SCNM_GetStatus, result, "result"),
};

const dvbjni::JavaField kServiceFields[] = {
        JF_INT(SCNM_ServiceInfo, svcType, "svcType"),
        JF_INT(SCNM_ServiceInfo, svcId, "svcId"),
        JF_INT(SCNM_ServiceInfo, videoPid, "videoPid"),
        JF_INT(SCNM_ServiceInfo, videoType, "videoType"),
        JF_INT(SCNM_ServiceInfo, audioPid, "audioPid"),
        JF_INT(SCNM_ServiceInfo, audioType, "audioType"),
        JF_INT(SCNM_ServiceInfo, pcrPid, "pcrPid"),
        JF_INT(SCNM_ServiceInfo, pmtPid, "pmtPid"),
        JF_INT(SCNM_ServiceInfo, tsId, "tsId"),
        JF_INT(SCNM_ServiceInfo, onId, "onId"),
        JF_LONG(SCNM_ServiceInfo, lcn, "lcn"),
        JF_INT(SCNM_ServiceInfo, content, "content"),
        JF_INT(SCNM_ServiceInfo, caSysId0, "caSysId0"),
        JF_INT(SCNM_ServiceInfo, caSysId1, "caSysId1"),
        JF_INT(SCNM_ServiceInfo, caSysId2, "caSysId2"),
        JF_TEXT(SCNM_ServiceInfo, svcName, "svcName", Bytes),
};

const dvbjni::JavaField kNetworkFields[] = {
        JF_INT(SCNMNET_FrontEndSettings, type, "type"),
        JF_INT(SCNMNET_FrontEndSettings, frequency, "frequency"),
        JF_INT(SCNMNET_FrontEndSettings, symbolRate, "symbolRate"),
        JF_INT(SCNMNET_FrontEndSettings, fecInner, "fecInner"),
        JF_INT(SCNMNET_FrontEndSettings, modulation, "modulation"),
        JF_INT(SCNMNET_FrontEndSettings, polarization, "polarization"),
        JF_INT(SCNMNET_FrontEndSettings, rolloff, "rolloff"),
};

const dvbjni::JavaField kConfigFields[] = {
        JF_INT(DVB_Config, displayMode, "displayMode"),
        JF_INT(DVB_Config, sdkMode, "sdkMode"),
};

// ---- scan control ------------------------------------------------------------------------

// Fills the zeroed `rec`, with one look-up of the class; the reserved words stay 0. The
// language code keeps its first three bytes, and a shorter code leaves zeros after its own.
bool readStartSettings(JNIEnv* env, jobject settings, SCNM_StartSettings* rec) {
    memcpy(rec->langCode, "eng", 3);
    return dvbjni::readFrontend(env, settings, kStartClass, &rec->fe, kStartFields,
                                NELEM(kStartFields), rec);
}

jint Scnm_Init(JNIEnv* env, jobject thiz) {
    sp<Scnm> scnm = requireScnm(env, thiz, kControlFailure);
    return scnm == nullptr ? -1 : scnm->Init();
}

// The module's handle, sign-extended: a negative answer reaches Java as a negative handle.
jlong Scnm_Open(JNIEnv* env, jobject thiz, jobject settings) {
    sp<Scnm> scnm = requireScnm(env, thiz, kControlFailure);
    if (scnm == nullptr) return -1;
    SCNM_OpenSettings rec{};
    if (!dvbjni::readFields(env, settings, kOpenClass, kOpenFields, &rec)) return -1;
    return jlong{scnm->Open(&rec)};
}

jint Scnm_Close(JNIEnv* env, jobject thiz, jlong handle) {
    sp<Scnm> scnm = requireScnm(env, thiz, kControlFailure);
    return scnm == nullptr ? -1 : scnm->Close(lowHandle(handle));
}

jint Scnm_Start(JNIEnv* env, jobject thiz, jlong handle, jobject settings) {
    sp<Scnm> scnm = requireScnm(env, thiz, kControlFailure);
    if (scnm == nullptr) return -1;
    SCNM_StartSettings rec{};
    if (!readStartSettings(env, settings, &rec)) return -1;
    return scnm->Start(lowHandle(handle), &rec);
}

jint Scnm_Stop(JNIEnv* env, jobject thiz, jlong handle) {
    sp<Scnm> scnm = requireScnm(env, thiz, kControlFailure);
    return scnm == nullptr ? -1 : scnm->Stop(lowHandle(handle));
}

// Returns 0 whatever the module answered; its outcome travels in the record's result word.
jint Scnm_GetStatus(JNIEnv* env, jobject thiz, jlong handle, jobject status) {
    sp<Scnm> scnm = requireScnm(env, thiz, kControlFailure);
    if (scnm == nullptr || !dvbjni::requireObject(env, status, kStatusClass)) return -1;
    dvbjni::FieldIds ids;
    if (!ids.lookup(env, kStatusClass, kStatusFields)) return -1;
    SCNM_GetStatus rec{};
    scnm->GetStatus(lowHandle(handle), &rec);
    return dvbjni::writeRecord(env, status, kStatusFields, ids, NELEM(kStatusFields), &rec) ? 0
                                                                                            : -1;
}

// ---- scan results ------------------------------------------------------------------------

// Copies the module's list into `cache` from entry 0 and returns the number of nodes copied.
// The walk stops at the cache's end, which also ends a list that loops back on itself.
template <typename Node, size_t N>
jint copyList(const Node* head, Node (&cache)[N]) {
    size_t count = 0;
    for (const Node* node = head; node != nullptr && count < N; node = dvbListNext(node)) {
        cache[count++] = *node;
    }
    return static_cast<jint>(count);
}

jint Scnm_CreateServiceList(JNIEnv* env, jobject thiz, jlong handle) {
    sp<Scnm> scnm = requireScnm(env, thiz, kResultFailure);
    if (scnm == nullptr) return -1;
    SCNM_ServiceInfo* head = nullptr;
    scnm->CreateServiceList(lowHandle(handle), &head);
    return copyList(head, s_SvcExt);
}

jint Scnm_GetServiceList(JNIEnv* env, jobject thiz, jint index, jobject info) {
    sp<Scnm> scnm = requireScnm(env, thiz, kResultFailure);
    if (scnm == nullptr || !dvbjni::checkIndex(env, index, NELEM(s_SvcExt))) return -1;
    return dvbjni::writeFields(env, info, kServiceClass, kServiceFields, &s_SvcExt[index]) ? 0 : -1;
}

jint Scnm_CreateNetworkList(JNIEnv* env, jobject thiz, jlong handle) {
    sp<Scnm> scnm = requireScnm(env, thiz, kResultFailure);
    if (scnm == nullptr) return -1;
    SCNMNET_FrontEndSettings* head = nullptr;
    scnm->CreateNetworkList(lowHandle(handle), &head);
    return copyList(head, s_SvcNet);
}

// Both of its lines name the service method; the closing one only after a successful read.
jint Scnm_GetNetworkList(JNIEnv* env, jobject thiz, jint index, jobject settings) {
    dvbjni::logLine(ANDROID_LOG_VERBOSE, kTag, "+++android_dvb_Scnm_GetServiceList");
    sp<Scnm> scnm = requireScnm(env, thiz, kResultFailure);
    if (scnm == nullptr || !dvbjni::checkIndex(env, index, NELEM(s_SvcNet)) ||
        !dvbjni::writeFields(env, settings, kNetworkClass, kNetworkFields, &s_SvcNet[index])) {
        return -1;
    }
    dvbjni::logLine(ANDROID_LOG_VERBOSE, kTag, "----android_dvb_Scnm_GetServiceList");
    return 0;
}

// ---- system start-up and shut-down: 0 whatever the module answered -----------------------

// Without a bound, as on the device: a service that never creates the file keeps the caller
// here for good.
void waitForEventDatabase() {
    struct stat st;
    while (stat(DVB_EPG_DB_PATH, &st) != 0) usleep(500000);
}

// Returns once the service's event database exists, holding the module until then.
jint Dvb_SystemInit(JNIEnv* env, jobject thiz, jobject config) {
    sp<Scnm> scnm = requireScnm(env, thiz, kResultFailure);
    if (scnm == nullptr) return -1;
    DVB_Config rec{};
    if (!dvbjni::readFields(env, config, kConfigClass, kConfigFields, &rec)) return -1;
    scnm->Dvb_SystemInit(&rec);
    waitForEventDatabase();
    return 0;
}

jint Dvb_SystemUnInit(JNIEnv* env, jobject thiz, jobject config) {
    sp<Scnm> scnm = requireScnm(env, thiz, kResultFailure);
    if (scnm == nullptr) return -1;
    DVB_Config rec{};
    if (!dvbjni::readFields(env, config, kConfigClass, kConfigFields, &rec)) return -1;
    scnm->Dvb_SystemUnInit(&rec);
    return 0;
}

const JNINativeMethod gMethods[] = {
        MAKE_JNI_NATIVE_METHOD("Scnm_Init", "()I", Scnm_Init),
        MAKE_JNI_NATIVE_METHOD("Scnm_Open", "(Landroid/DVB/Scnm$SCNM_OpenSettings;)J", Scnm_Open),
        MAKE_JNI_NATIVE_METHOD("Scnm_Close", "(J)I", Scnm_Close),
        MAKE_JNI_NATIVE_METHOD("Scnm_Start", "(JLandroid/DVB/Scnm$SCNM_StartSettings;)I",
                               Scnm_Start),
        MAKE_JNI_NATIVE_METHOD("Scnm_Stop", "(J)I", Scnm_Stop),
        MAKE_JNI_NATIVE_METHOD("Scnm_GetStatus", "(JLandroid/DVB/Scnm$SCNM_GetStatus;)I",
                               Scnm_GetStatus),
        MAKE_JNI_NATIVE_METHOD("Scnm_CreateServiceList", "(J)I", Scnm_CreateServiceList),
        MAKE_JNI_NATIVE_METHOD("Scnm_GetServiceList", "(ILandroid/DVB/Scnm$SCNM_ServiceInfo;)I",
                               Scnm_GetServiceList),
        MAKE_JNI_NATIVE_METHOD("Scnm_CreateNetworkList", "(J)I", Scnm_CreateNetworkList),
        MAKE_JNI_NATIVE_METHOD("Scnm_GetNetworkList",
                               "(ILandroid/DVB/Scnm$SCNMNET_FrontEndSettings;)I",
                               Scnm_GetNetworkList),
        MAKE_JNI_NATIVE_METHOD("Dvb_SystemInit", "(Landroid/DVB/Scnm$DVB_Config;)I",
                               Dvb_SystemInit),
        MAKE_JNI_NATIVE_METHOD("Dvb_SystemUnInit", "(Landroid/DVB/Scnm$DVB_Config;)I",
                               Dvb_SystemUnInit),
};
static_assert(NELEM(gMethods) == 12, "android.DVB.Scnm declares 12 natives");

}  // namespace

void Scnmnotify(int, int, int) {}

int register_android_dvb_Scnm(JNIEnv* env) {
    if (!dvbjni::findContextField(env, "android/DVB/Scnm", "Can't find android/DVB/Scnm",
                                  "Can't find Tuner.mNativeContext", &gContext)) {
        __android_log_print(ANDROID_LOG_VERBOSE, kTag,
                            "register_android_dvb_Scnm failed, could not find the filed");
        return -1;
    }
    return android::AndroidRuntime::registerNativeMethods(env, "android/DVB/Scnm", gMethods,
                                                          NELEM(gMethods));
}
