// The Java class android.DVB.Strm: stream playback, its settings, status and components, the
// present and following events of a stream and the event database, on the stream module.
#include <DVB.h>
#include <android/log.h>
#include <android_runtime/AndroidRuntime.h>
#include <nativehelper/JNIHelp.h>
#include <nativehelper/jni_macros.h>
#include <nativehelper/scoped_local_ref.h>

#include <cstring>

#include "Fields.h"
#include "Frontend.h"
#include "Module.h"
#include "Registration.h"
#include "Text.h"

using android::DVB;
using android::sp;
using android::Strm;
using dvbjni::Conv;
using dvbjni::JavaField;
using dvbjni::lowHandle;
using dvbjni::requireModule;
using dvbjni::requireObject;

// Exported caches, zero at load. Strm_CreatStreamInfo overwrites the first `count` entries of
// each component list and the CA system ids; Strm_GetAllEvent and EPG_GetEvent overwrite the
// first `itemCount` extended-event items. Entries beyond a count keep what an earlier query
// left. Java serialises a query and the reads that follow it, so no lock guards them.
extern "C" {
DVB_EXPORT VideoContent videoContents[kStreamComponents];
DVB_EXPORT AudioContent audioContents[kStreamComponents];
DVB_EXPORT SubtitleContent subtitleContents[kStreamComponents];
DVB_EXPORT TeletextContent teletextContents[kStreamComponents];
DVB_EXPORT uint16_t caSysId[3];
DVB_EXPORT ExtEpgEventItem EpgExtentItemNow[kExtEpgItems];
DVB_EXPORT ExtEpgEventItem EpgExtentItemNext[kExtEpgItems];
}

namespace {

constexpr const char* kTag = "STRM";

jfieldID gContext;          // Strm.mNativeContext
dvbjni::StaticMutex sLock;  // created and destroyed with the library; never locked

// The stream module of the DVB object that thiz is bound to, or null.
sp<Strm> getStrm(JNIEnv* env, jobject thiz) {
    jint context;
    return dvbjni::moduleOf(dvbjni::boundDvb(env, thiz, gContext, &context), &DVB::mStrm);
}

// A Java object that a method fills after its module call. prepare() checks the object and
// looks its fields up before the module is called, so a null object or a missing field stops
// the method without a module call and without a half-filled set of objects.
class Output {
public:
    template <size_t N>
    Output(jobject object, const char* className, const JavaField (&map)[N])
        : mObject(object), mClass(className), mMap(map), mCount(N) {
        static_assert(N <= dvbjni::FieldIds::kMax, "map too long");
    }

    bool prepare(JNIEnv* env) {
        return requireObject(env, mObject, mClass) && mIds.lookup(env, mClass, mMap, mCount);
    }

    bool write(JNIEnv* env, const void* record) const {
        return dvbjni::writeRecord(env, mObject, mMap, mIds, mCount, record);
    }

private:
    jobject mObject;
    const char* mClass;
    const JavaField* mMap;
    size_t mCount;
    dvbjni::FieldIds mIds;
};

template <size_t N>
bool prepareAll(JNIEnv* env, Output (&outputs)[N]) {
    for (Output& o : outputs) {
        if (!o.prepare(env)) return false;
    }
    return true;
}

// ---- stream control and settings ----------------------------------------------------------

constexpr const char* kOpenSettingsClass = "android/DVB/Strm$STRM_OpenSettings";
constexpr const char* kFrontEndClass = "android/DVB/Strm$STRM_FrontEnd";
constexpr const char* kServiceClass = "android/DVB/Strm$STRM_Service";
constexpr const char* kLangCodeClass = "android/DVB/Strm$STRM_LangCode";
constexpr const char* kPvrSettingClass = "android/DVB/Strm$STRM_PvrSetting";

// szPath comes last: it is read on its own, because a path that does not fit is refused.
constexpr JavaField kOpenSettingsFields[] = {
        JF_INT(STRM_OpenSettings, frontend, "frontend"),
        JF_INT(STRM_OpenSettings, demux, "demux"),
        JF_INT(STRM_OpenSettings, video, "video"),
        JF_INT(STRM_OpenSettings, audio, "audio"),
        JF_TEXT(STRM_OpenSettings, szPath, "szPath", Text),
};
constexpr size_t kPathField = NELEM(kOpenSettingsFields) - 1;
static_assert(kOpenSettingsFields[kPathField].conv == Conv::Text, "szPath is the last field");

// STRM_FrontEnd's field beyond the shared front-end block, for Strm_Start.
const JavaField kOrbitalField[] = {
        JF_INT(STRM_Settings, orbital_position, "orbital_position"),
};

// The front-end fields that the settings exchange: not `type`, not `bandwidth`. Offsets 8 to
// 24 always carry the code-0 parameters, whatever type code the module keeps at 0.
const JavaField kSettingsFrontEndFields[] = {
        JF_INT(STRM_Settings, fe.frequency, "frequency"),
        JF_INT(STRM_Settings, fe.symbolRate, "symbolRate"),
        JF_INT(STRM_Settings, fe.fecInner, "fecInner"),
        JF_INT(STRM_Settings, fe.modulation, "modulation"),
        JF_INT(STRM_Settings, fe.polarization, "polarization"),
        JF_INT(STRM_Settings, fe.rolloff, "rolloff"),
        JF_INT(STRM_Settings, orbital_position, "orbital_position"),
        JF_INT(STRM_Settings, fe.diseqctype, "diseqctype"),
        JF_INT(STRM_Settings, fe.tone, "tone"),
        JF_INT(STRM_Settings, fe.lnbpower, "lnbpower"),
        JF_INT(STRM_Settings, fe.lnbLowLO, "lnbLowLO"),
        JF_INT(STRM_Settings, fe.lnbHigLO, "lnbHigLO"),
        JF_INT(STRM_Settings, fe.port, "port"),
        JF_INT(STRM_Settings, fe.port16, "port16"),
        JF_INT(STRM_Settings, fe.posIndex, "posIndex"),
        JF_INT(STRM_Settings, fe.satPosition, "satPosition"),
        JF_INT(STRM_Settings, fe.myLongitude, "myLongitude"),
        JF_INT(STRM_Settings, fe.myLatitude, "myLatitude"),
        JF_INT(STRM_Settings, fe.toneBurst, "toneBurst"),
        JF_INT(STRM_Settings, fe.ubSlot, "ubSlot"),
        JF_INT(STRM_Settings, fe.ubFreq, "ubFreq"),
        JF_INT(STRM_Settings, fe.ubSat, "ubSat"),
        JF_INT(STRM_Settings, fe.out5v, "out5v"),
};

const JavaField kServiceFields[] = {
        JF_INT(STRM_Settings, svcId, "svcId"),         JF_INT(STRM_Settings, videoPid, "videoPid"),
        JF_INT(STRM_Settings, videoType, "videoType"), JF_INT(STRM_Settings, audioPid, "audioPid"),
        JF_INT(STRM_Settings, audioType, "audioType"), JF_INT(STRM_Settings, pcrPid, "pcrPid"),
        JF_INT(STRM_Settings, pmtPid, "pmtPid"),       JF_INT(STRM_Settings, caSysId0, "caSysId0"),
        JF_INT(STRM_Settings, caSysId1, "caSysId1"),   JF_INT(STRM_Settings, caSysId2, "caSysId2"),
        JF_INT(STRM_Settings, tsIndex, "tsIndex"),
};

const JavaField kLangCodeFields[] = {
        JF_TEXT(STRM_Settings, langCode0, "langCode0", LangCode),
        JF_TEXT(STRM_Settings, langCode1, "langCode1", LangCode),
};

const JavaField kPvrSettingFields[] = {
        JF_INT(STRM_Settings, playSpeed, "playSpeed"),
        JF_INT(STRM_Settings, playSpeedDiv, "playSpeedDiv"),
        JF_INT(STRM_Settings, posTime, "posTime"),
};

// Fills `rec`, which is zero. A path longer than the field's 127 bytes is refused: cut, it
// would name another file.
bool readOpenSettings(JNIEnv* env, jobject settings, STRM_OpenSettings* rec) {
    if (!requireObject(env, settings, kOpenSettingsClass)) return false;
    dvbjni::FieldIds ids;
    if (!ids.lookup(env, kOpenSettingsClass, kOpenSettingsFields) ||
        !dvbjni::readRecord(env, settings, kOpenSettingsClass, kOpenSettingsFields, ids, kPathField,
                            rec)) {
        return false;
    }
    ScopedLocalRef<jstring> path(
            env, static_cast<jstring>(env->GetObjectField(settings, ids[kPathField])));
    constexpr size_t kRoom = sizeof rec->szPath - 1;
    int64_t length = dvbjni::copyStringBytes(env, path.get(), rec->szPath, kRoom,
                                             "STRM_OpenSettings.szPath");
    if (length < 0) return false;
    if (static_cast<uint64_t>(length) > kRoom) {
        dvbjni::throwIllegalArgument(env, "STRM_OpenSettings.szPath is %lld bytes; at most %zu fit",
                                     static_cast<long long>(length), kRoom);
        return false;
    }
    return true;
}

jint Strm_Init(JNIEnv* env, jobject thiz) {
    sp<Strm> strm = requireModule(env, getStrm(env, thiz));
    return strm == nullptr ? -1 : strm->Init();
}

// The module's handle, or its negative error code, sign-extended.
jlong Strm_Open(JNIEnv* env, jobject thiz, jobject settings) {
    sp<Strm> strm = requireModule(env, getStrm(env, thiz));
    if (strm == nullptr) return -1;
    STRM_OpenSettings rec{};
    if (!readOpenSettings(env, settings, &rec)) return -1;
    return strm->Open(&rec);
}

// Returns 0 whatever the module answered.
jint Strm_Close(JNIEnv* env, jobject thiz, jlong handle) {
    sp<Strm> strm = requireModule(env, getStrm(env, thiz));
    if (strm == nullptr) return -1;
    strm->Close(lowHandle(handle));
    return 0;
}

// The front-end block follows the tuning rule; the PVR fields stay 0.
jint Strm_Start(JNIEnv* env, jobject thiz, jlong handle, jobject service, jobject langCode,
                jobject frontEnd) {
    sp<Strm> strm = requireModule(env, getStrm(env, thiz));
    if (strm == nullptr) return -1;
    STRM_Settings rec{};
    if (!dvbjni::readFrontend(env, frontEnd, kFrontEndClass, &rec.fe, kOrbitalField,
                              NELEM(kOrbitalField), &rec) ||
        !dvbjni::readFields(env, service, kServiceClass, kServiceFields, &rec) ||
        !dvbjni::readFields(env, langCode, kLangCodeClass, kLangCodeFields, &rec)) {
        return -1;
    }
    return strm->Start(lowHandle(handle), &rec);
}

jint Strm_Stop(JNIEnv* env, jobject thiz, jlong handle, jboolean flag) {
    sp<Strm> strm = requireModule(env, getStrm(env, thiz));
    return strm == nullptr ? -1 : strm->Stop(lowHandle(handle), flag ? 1 : 0);
}

// Returns 0 whatever the module answered; Java's `type` and `bandwidth` are left as they are.
jint Strm_GetSettings(JNIEnv* env, jobject thiz, jlong handle, jobject service, jobject pvr,
                      jobject langCode, jobject frontEnd) {
    sp<Strm> strm = requireModule(env, getStrm(env, thiz));
    if (strm == nullptr) return -1;
    Output outputs[] = {
            {service, kServiceClass, kServiceFields},
            {pvr, kPvrSettingClass, kPvrSettingFields},
            {frontEnd, kFrontEndClass, kSettingsFrontEndFields},
            {langCode, kLangCodeClass, kLangCodeFields},
    };
    if (!prepareAll(env, outputs)) return -1;
    STRM_Settings rec{};
    strm->GetSettings(lowHandle(handle), &rec);
    for (const Output& o : outputs) {
        if (!o.write(env, &rec)) return -1;
    }
    return 0;
}

// Always sends type code 0 with its five parameters, never a bandwidth. Returns 0 whatever
// the module answered.
jint Strm_SetSettings(JNIEnv* env, jobject thiz, jlong handle, jobject service, jobject pvr,
                      jobject langCode, jobject frontEnd) {
    sp<Strm> strm = requireModule(env, getStrm(env, thiz));
    if (strm == nullptr) return -1;
    STRM_Settings rec{};
    if (!dvbjni::readFields(env, frontEnd, kFrontEndClass, kSettingsFrontEndFields, &rec) ||
        !dvbjni::readFields(env, service, kServiceClass, kServiceFields, &rec) ||
        !dvbjni::readFields(env, pvr, kPvrSettingClass, kPvrSettingFields, &rec) ||
        !dvbjni::readFields(env, langCode, kLangCodeClass, kLangCodeFields, &rec)) {
        return -1;
    }
    strm->SetSettings(lowHandle(handle), &rec);
    return 0;
}

// ---- stream status -------------------------------------------------------------------------

constexpr const char* kStatusClass = "android/DVB/Strm$STRM_GetStatus";

// In Java's order. The record keeps the recording's end time before its current time and the
// playback event before the playback times.
const JavaField kStatusFields[] = {
        JF_INT(STRM_GetStatus, feStatus, "feStatus"),
        JF_INT(STRM_GetStatus, feStrength, "feStrength"),
        JF_INT(STRM_GetStatus, feBer, "feBer"),
        JF_INT(STRM_GetStatus, feSnr, "feSnr"),
        JF_INT(STRM_GetStatus, videoPts, "videoPts"),
        JF_INT(STRM_GetStatus, audioPts, "audioPts"),
        JF_INT(STRM_GetStatus, localPts, "localPts"),
        JF_INT(STRM_GetStatus, fpsInteger, "fpsInteger"),
        JF_INT(STRM_GetStatus, fpsDecimal, "fpsDecimal"),
        JF_INT(STRM_GetStatus, pictureStatus, "pictureStatus"),
        JF_INT(STRM_GetStatus, recstate, "recstate"),
        JF_INT(STRM_GetStatus, recduration, "recduration"),
        JF_LONG(STRM_GetStatus, recsize, "recsize"),
        JF_INT(STRM_GetStatus, recevent, "recevent"),
        JF_INT(STRM_GetStatus, recstartTime, "recstartTime"),
        JF_INT(STRM_GetStatus, reccurTime, "reccurTime"),
        JF_INT(STRM_GetStatus, recendTime, "recendTime"),
        JF_INT(STRM_GetStatus, pbstate, "pbstate"),
        JF_INT(STRM_GetStatus, pbposition, "pbposition"),
        JF_INT(STRM_GetStatus, pbstartTime, "pbstartTime"),
        JF_INT(STRM_GetStatus, pbendTime, "pbendTime"),
        JF_INT(STRM_GetStatus, pbevent, "pbevent"),
        JF_INT(STRM_GetStatus, result, "result"),
};

// Returns 0 whatever the module answered; its outcome travels in the record's `result`.
jint Strm_GetStatus(JNIEnv* env, jobject thiz, jlong handle, jobject status) {
    sp<Strm> strm = requireModule(env, getStrm(env, thiz));
    if (strm == nullptr) return -1;
    Output out(status, kStatusClass, kStatusFields);
    if (!out.prepare(env)) return -1;
    STRM_GetStatus rec{};
    strm->GetStatus(lowHandle(handle), &rec);
    return out.write(env, &rec) ? 0 : -1;
}

// ---- stream components ---------------------------------------------------------------------

constexpr const char* kStreamInfoClass = "android/DVB/Strm$STRM_StreamInfo";
constexpr const char* kVideoClass = "android/DVB/Strm$VideoContent";
constexpr const char* kAudioClass = "android/DVB/Strm$AudioContent";
constexpr const char* kSubtitleClass = "android/DVB/Strm$SubtitleContent";
constexpr const char* kTeletextClass = "android/DVB/Strm$TeletextContent";

const JavaField kStreamInfoFields[] = {
        JF_INT(STRM_StreamInfo, videoCount, "videoCount"),
        JF_INT(STRM_StreamInfo, audioCount, "audioCount"),
        JF_INT(STRM_StreamInfo, teletextCount, "teletextCount"),
        JF_INT(STRM_StreamInfo, subtitleCount, "subtitleCount"),
        JF_INT(STRM_StreamInfo, pcrPid, "pcrPid"),
        JF_INT(STRM_StreamInfo, caSysId[0], "caSysId0"),
        JF_INT(STRM_StreamInfo, caSysId[1], "caSysId1"),
        JF_INT(STRM_StreamInfo, caSysId[2], "caSysId2"),
};

const JavaField kVideoFields[] = {
        JF_INT(VideoContent, pid, "pid"),
        JF_INT(VideoContent, type, "type"),
};

const JavaField kAudioFields[] = {
        JF_INT(AudioContent, pid, "pid"),
        JF_INT(AudioContent, isDolbyAC3, "isDolbyAC3"),
        JF_INT(AudioContent, type, "type"),
        JF_TEXT(AudioContent, langCode0, "langCode0", LangCode),
        JF_TEXT(AudioContent, langCode1, "langCode1", LangCode),
        JF_INT(AudioContent, componetTag, "componetTag"),
        JF_TEXT(AudioContent, streamName, "streamName", Text),
};

const JavaField kSubtitleFields[] = {
        JF_INT(SubtitleContent, pid, "pid"),
        JF_INT(SubtitleContent, type, "type"),
        JF_TEXT(SubtitleContent, langCode, "langCode", LangCode),
        JF_INT(SubtitleContent, magazineNumber, "magazineNumber"),
        JF_INT(SubtitleContent, pageNumber, "pageNumber"),
        JF_INT(SubtitleContent, compositionPageId, "compositionPageId"),
        JF_INT(SubtitleContent, ancillaryPageId, "ancillaryPageId"),
};

const JavaField kTeletextFields[] = {
        JF_INT(TeletextContent, pid, "pid"),
        JF_INT(TeletextContent, type, "type"),
        JF_TEXT(TeletextContent, langCode, "langCode", LangCode),
        JF_INT(TeletextContent, magazineNumber, "magazineNumber"),
        JF_INT(TeletextContent, pageNumber, "pageNumber"),
        JF_INT(TeletextContent, componetTag, "componetTag"),
        JF_TEXT(TeletextContent, streamName, "streamName", Text),
};

// Copies the first `count` entries of a list into its cache and returns the count that Java
// is told: the record and the cache hold 16 entries, so a larger count copies and reports 16;
// a count of 0 or below copies nothing and is reported as it is.
template <typename Entry>
int32_t copyComponents(const Entry (&list)[kStreamComponents], int32_t count,
                       Entry (&cache)[kStreamComponents]) {
    int32_t copied = count < kStreamComponents ? count : kStreamComponents;
    if (copied > 0) memcpy(cache, list, copied * sizeof(Entry));
    return copied;
}

// Returns 0 whatever the module answered.
jint Strm_CreatStreamInfo(JNIEnv* env, jobject thiz, jlong handle, jobject info) {
    sp<Strm> strm = requireModule(env, getStrm(env, thiz));
    if (strm == nullptr) return -1;
    Output out(info, kStreamInfoClass, kStreamInfoFields);
    if (!out.prepare(env)) return -1;
    STRM_StreamInfo rec{};
    strm->CreatStreamInfo(lowHandle(handle), &rec);
    rec.videoCount = copyComponents(rec.video, rec.videoCount, videoContents);
    rec.audioCount = copyComponents(rec.audio, rec.audioCount, audioContents);
    rec.teletextCount = copyComponents(rec.teletext, rec.teletextCount, teletextContents);
    rec.subtitleCount = copyComponents(rec.subtitle, rec.subtitleCount, subtitleContents);
    memcpy(caSysId, rec.caSysId, sizeof caSysId);
    return out.write(env, &rec) ? 0 : -1;
}

// Fills `object` from entry `index` of `cache`. The module is fetched only to fail without
// one; none of its operations is called.
template <typename Entry, int N, size_t M>
jint readCacheEntry(JNIEnv* env, jobject thiz, jint index, jobject object, const char* className,
                    const JavaField (&map)[M], const Entry (&cache)[N]) {
    sp<Strm> strm = requireModule(env, getStrm(env, thiz));
    if (strm == nullptr || !requireObject(env, object, className) ||
        !dvbjni::checkIndex(env, index, N)) {
        return -1;
    }
    return dvbjni::writeFields(env, object, className, map, &cache[index]) ? 0 : -1;
}

jint Strm_GetVideoStreamInfo(JNIEnv* env, jobject thiz, jint index, jobject content) {
    return readCacheEntry(env, thiz, index, content, kVideoClass, kVideoFields, videoContents);
}

jint Strm_GetAudioStreamInfo(JNIEnv* env, jobject thiz, jint index, jobject content) {
    return readCacheEntry(env, thiz, index, content, kAudioClass, kAudioFields, audioContents);
}

jint Strm_GetSubTilteStreamInfo(JNIEnv* env, jobject thiz, jint index, jobject content) {
    return readCacheEntry(env, thiz, index, content, kSubtitleClass, kSubtitleFields,
                          subtitleContents);
}

jint Strm_GetTeleTextStreamInfo(JNIEnv* env, jobject thiz, jint index, jobject content) {
    return readCacheEntry(env, thiz, index, content, kTeletextClass, kTeletextFields,
                          teletextContents);
}

// ---- event information ---------------------------------------------------------------------

constexpr const char* kEpgEventClass = "android/DVB/Strm$EpgEvent";
constexpr const char* kExtEpgEventClass = "android/DVB/Strm$ExtEpgEvent";
constexpr const char* kExtEpgEventItemClass = "android/DVB/Strm$ExtEpgEventItem";
constexpr const char* kEpgSvcClass = "android/DVB/Strm$EpgSvc";
constexpr const char* kServiceCheckClass = "android/DVB/Strm$ServiceCheck";

// `name` and `text` reach Java as exactly their bytes, in every method that delivers an event:
// broadcast text selects its own character table with a leading byte (EN 300 468 Annex A),
// which modified UTF-8 does not describe, so only the app can decode it with the right table.
const JavaField kEpgEventFields[] = {
        JF_INT(EpgEvent, evtId, "evtId"),
        JF_INT(EpgEvent, startTime, "startTime"),
        JF_INT(EpgEvent, duration, "duration"),
        JF_INT(EpgEvent, runStatus, "runStatus"),
        JF_INT(EpgEvent, parentalRating, "parentalRating"),
        JF_INT(EpgEvent, content, "content"),
        JF_INT(EpgEvent, refSvcId, "refSvcId"),
        JF_INT(EpgEvent, refEvtId, "refEvtId"),
        JF_TEXT(EpgEvent, name, "name", Bytes),
        JF_TEXT(EpgEvent, text, "text", Bytes),
        JF_INT(EpgEvent, extendedFlag, "extendedFlag"),
};

const JavaField kExtEpgEventFields[] = {
        JF_INT(ExtEpgEvent, itemCount, "itemCount"),
        JF_TEXT(ExtEpgEvent, text, "text", Text),
};

const JavaField kExtEpgEventItemFields[] = {
        JF_TEXT(ExtEpgEventItem, itemDesc, "itemDesc", TextOrNull),
        JF_TEXT(ExtEpgEventItem, itemText, "type", TextOrNull),
};

// EPG_GetEvent names the service by its three ids; the indexes and the type stay 0.
const JavaField kEpgSvcIdFields[] = {
        JF_INT(EpgSvc, svcId, "svcId"),
        JF_INT(EpgSvc, tsId, "tsId"),
        JF_INT(EpgSvc, onId, "onId"),
};

const JavaField kEpgSvcFields[] = {
        JF_INT(EpgSvc, svcId, "svcId"),       JF_INT(EpgSvc, tsId, "tsId"),
        JF_INT(EpgSvc, onId, "onId"),         JF_INT(EpgSvc, tpIndex, "tpIndex"),
        JF_INT(EpgSvc, netIndex, "netIndex"), JF_INT(EpgSvc, netType, "netType"),
};

const JavaField kServiceCheckFields[] = {
        JF_INT(ServiceCheck, satPosition, "satPosition"),
        JF_INT(ServiceCheck, freq, "freq"),
        JF_INT(ServiceCheck, tsid, "tsid"),
        JF_INT(ServiceCheck, sid, "sid"),
};

// The record and each cache hold 16 items: a larger itemCount is cut to 16 in the record, so
// that Java is told how many items were copied.
void boundItemCount(ExtEpgEvent* ext) {
    if (ext->itemCount > static_cast<uint32_t>(kExtEpgItems)) ext->itemCount = kExtEpgItems;
}

// Overwrites the first itemCount entries of `cache`; the later ones keep older items.
void copyItems(const ExtEpgEvent& ext, ExtEpgEventItem (&cache)[kExtEpgItems], bool log) {
    for (uint32_t k = 0; k < ext.itemCount; ++k) {
        const ExtEpgEventItem& item = ext.items[k];
        if (log) {
            // Either field may fill its width without a zero byte.
            __android_log_print(ANDROID_LOG_VERBOSE, kTag, "mExtEvtNow item: %.*s itemDesc : %.*s",
                                static_cast<int>(sizeof item.itemText), item.itemText,
                                static_cast<int>(sizeof item.itemDesc), item.itemDesc);
        }
        cache[k] = item;
    }
}

// Returns 0 whatever the module answered. Both caches get their items, with one log line for
// each item copied (the following event's lines read "mExtEvtNow" too).
jint Strm_GetAllEvent(JNIEnv* env, jobject thiz, jlong handle, jobject present, jobject following,
                      jobject presentExt, jobject followingExt) {
    sp<Strm> strm = requireModule(env, getStrm(env, thiz));
    if (strm == nullptr) return -1;
    Output outputs[] = {
            {present, kEpgEventClass, kEpgEventFields},
            {following, kEpgEventClass, kEpgEventFields},
            {presentExt, kExtEpgEventClass, kExtEpgEventFields},
            {followingExt, kExtEpgEventClass, kExtEpgEventFields},
    };
    if (!prepareAll(env, outputs)) return -1;
    EpgEvent now{};
    EpgEvent next{};
    ExtEpgEvent nowExt{};
    ExtEpgEvent nextExt{};
    strm->GetAllEvent(lowHandle(handle), &now, &next, &nowExt, &nextExt);
    boundItemCount(&nowExt);
    boundItemCount(&nextExt);
    if (!outputs[0].write(env, &now) || !outputs[1].write(env, &next) ||
        !outputs[2].write(env, &nowExt) || !outputs[3].write(env, &nextExt)) {
        return -1;
    }
    copyItems(nowExt, EpgExtentItemNow, true);
    copyItems(nextExt, EpgExtentItemNext, true);
    return 0;
}

// Returns 0 whatever the module answered.
jint Strm_GetEvent(JNIEnv* env, jobject thiz, jlong handle, jobject event) {
    sp<Strm> strm = requireModule(env, getStrm(env, thiz));
    if (strm == nullptr) return -1;
    Output out(event, kEpgEventClass, kEpgEventFields);
    if (!out.prepare(env)) return -1;
    EpgEvent rec{};
    strm->GetEvent(lowHandle(handle), &rec);
    return out.write(env, &rec) ? 0 : -1;
}

jint Strm__GetExtEPGEventNow(JNIEnv* env, jobject thiz, jint index, jobject item) {
    return readCacheEntry(env, thiz, index, item, kExtEpgEventItemClass, kExtEpgEventItemFields,
                          EpgExtentItemNow);
}

jint Strm__GetExtEPGEventNext(JNIEnv* env, jobject thiz, jint index, jobject item) {
    return readCacheEntry(env, thiz, index, item, kExtEpgEventItemClass, kExtEpgEventItemFields,
                          EpgExtentItemNext);
}

// The module's 32-bit time, zero-extended: 4294967295 is a time, -1 means no module.
jlong Strm_GetTime(JNIEnv* env, jobject thiz, jlong handle, jlong /* unused */) {
    sp<Strm> strm = requireModule(env, getStrm(env, thiz));
    if (strm == nullptr) return -1;
    uint32_t time = 0;
    strm->GetTime(lowHandle(handle), &time);
    return static_cast<jlong>(time);
}

// Returns 0 whatever the module answered. The items go to EpgExtentItemNow, which the present
// event of Strm_GetAllEvent shares; no log line.
jint EPG_GetEvent(JNIEnv* env, jobject thiz, jlong handle, jobject service, jobject event,
                  jobject ext) {
    sp<Strm> strm = requireModule(env, getStrm(env, thiz));
    if (strm == nullptr) return -1;
    EpgSvc svc{};
    if (!dvbjni::readFields(env, service, kEpgSvcClass, kEpgSvcIdFields, &svc)) return -1;
    Output outputs[] = {
            {event, kEpgEventClass, kEpgEventFields},
            {ext, kExtEpgEventClass, kExtEpgEventFields},
    };
    if (!prepareAll(env, outputs)) return -1;
    EpgEvent rec{};
    ExtEpgEvent extRec{};
    strm->EPG_GetEvent(&svc, lowHandle(handle), &rec, &extRec);
    boundItemCount(&extRec);
    if (!outputs[0].write(env, &rec) || !outputs[1].write(env, &extRec)) return -1;
    copyItems(extRec, EpgExtentItemNow, false);
    return 0;
}

jint EPG_ExtGetEvent(JNIEnv* env, jobject thiz, jint index, jobject item) {
    return readCacheEntry(env, thiz, index, item, kExtEpgEventItemClass, kExtEpgEventItemFields,
                          EpgExtentItemNow);
}

// Returns 0 whatever the module answered.
jint EpgMd_AddService(JNIEnv* env, jobject thiz, jobject service) {
    sp<Strm> strm = requireModule(env, getStrm(env, thiz));
    if (strm == nullptr) return -1;
    EpgSvc rec{};
    if (!dvbjni::readFields(env, service, kEpgSvcClass, kEpgSvcFields, &rec)) return -1;
    strm->EpgMd_AddService(&rec);
    return 0;
}

// Returns 0 whatever the module answered.
jint EpgMd_ClearService(JNIEnv* env, jobject thiz) {
    sp<Strm> strm = requireModule(env, getStrm(env, thiz));
    if (strm == nullptr) return -1;
    strm->EpgMd_ClearService();
    return 0;
}

// The outcome of the check does not reach Java: 0 whatever the module answered.
jint Strm_CheckService(JNIEnv* env, jobject thiz, jobject check) {
    sp<Strm> strm = requireModule(env, getStrm(env, thiz));
    if (strm == nullptr) return -1;
    ServiceCheck rec{};
    if (!dvbjni::readFields(env, check, kServiceCheckClass, kServiceCheckFields, &rec)) return -1;
    strm->CheckService(&rec);
    return 0;
}

const JNINativeMethod gMethods[] = {
        MAKE_JNI_NATIVE_METHOD("Strm_Init", "()I", Strm_Init),
        MAKE_JNI_NATIVE_METHOD("Strm_Open", "(Landroid/DVB/Strm$STRM_OpenSettings;)J", Strm_Open),
        MAKE_JNI_NATIVE_METHOD("Strm_Close", "(J)I", Strm_Close),
        MAKE_JNI_NATIVE_METHOD("Strm_Start",
                               "(JLandroid/DVB/Strm$STRM_Service;Landroid/DVB/Strm$STRM_LangCode;"
                               "Landroid/DVB/Strm$STRM_FrontEnd;)I",
                               Strm_Start),
        MAKE_JNI_NATIVE_METHOD("Strm_Stop", "(JZ)I", Strm_Stop),
        MAKE_JNI_NATIVE_METHOD("Strm_GetSettings",
                               "(JLandroid/DVB/Strm$STRM_Service;Landroid/DVB/Strm$STRM_PvrSetting;"
                               "Landroid/DVB/Strm$STRM_LangCode;Landroid/DVB/Strm$STRM_FrontEnd;)I",
                               Strm_GetSettings),
        MAKE_JNI_NATIVE_METHOD("Strm_SetSettings",
                               "(JLandroid/DVB/Strm$STRM_Service;Landroid/DVB/Strm$STRM_PvrSetting;"
                               "Landroid/DVB/Strm$STRM_LangCode;Landroid/DVB/Strm$STRM_FrontEnd;)I",
                               Strm_SetSettings),
        MAKE_JNI_NATIVE_METHOD("Strm_GetStatus", "(JLandroid/DVB/Strm$STRM_GetStatus;)I",
                               Strm_GetStatus),
        MAKE_JNI_NATIVE_METHOD("Strm_CreatStreamInfo", "(JLandroid/DVB/Strm$STRM_StreamInfo;)I",
                               Strm_CreatStreamInfo),
        MAKE_JNI_NATIVE_METHOD("Strm_GetVideoStreamInfo", "(ILandroid/DVB/Strm$VideoContent;)I",
                               Strm_GetVideoStreamInfo),
        MAKE_JNI_NATIVE_METHOD("Strm_GetAudioStreamInfo", "(ILandroid/DVB/Strm$AudioContent;)I",
                               Strm_GetAudioStreamInfo),
        MAKE_JNI_NATIVE_METHOD("Strm_GetSubTilteStreamInfo",
                               "(ILandroid/DVB/Strm$SubtitleContent;)I",
                               Strm_GetSubTilteStreamInfo),
        MAKE_JNI_NATIVE_METHOD("Strm_GetTeleTextStreamInfo",
                               "(ILandroid/DVB/Strm$TeletextContent;)I",
                               Strm_GetTeleTextStreamInfo),
        MAKE_JNI_NATIVE_METHOD("Strm_GetAllEvent",
                               "(JLandroid/DVB/Strm$EpgEvent;Landroid/DVB/Strm$EpgEvent;"
                               "Landroid/DVB/Strm$ExtEpgEvent;Landroid/DVB/Strm$ExtEpgEvent;)I",
                               Strm_GetAllEvent),
        MAKE_JNI_NATIVE_METHOD("Strm_GetEvent", "(JLandroid/DVB/Strm$EpgEvent;)I", Strm_GetEvent),
        MAKE_JNI_NATIVE_METHOD("Strm__GetExtEPGEventNow", "(ILandroid/DVB/Strm$ExtEpgEventItem;)I",
                               Strm__GetExtEPGEventNow),
        MAKE_JNI_NATIVE_METHOD("Strm__GetExtEPGEventNext", "(ILandroid/DVB/Strm$ExtEpgEventItem;)I",
                               Strm__GetExtEPGEventNext),
        MAKE_JNI_NATIVE_METHOD("Strm_GetTime", "(JJ)J", Strm_GetTime),
        MAKE_JNI_NATIVE_METHOD("EPG_GetEvent",
                               "(JLandroid/DVB/Strm$EpgSvc;Landroid/DVB/Strm$EpgEvent;"
                               "Landroid/DVB/Strm$ExtEpgEvent;)I",
                               EPG_GetEvent),
        MAKE_JNI_NATIVE_METHOD("EPG_ExtGetEvent", "(ILandroid/DVB/Strm$ExtEpgEventItem;)I",
                               EPG_ExtGetEvent),
        MAKE_JNI_NATIVE_METHOD("EpgMd_AddService", "(Landroid/DVB/Strm$EpgSvc;)I",
                               EpgMd_AddService),
        MAKE_JNI_NATIVE_METHOD("EpgMd_ClearService", "()I", EpgMd_ClearService),
        MAKE_JNI_NATIVE_METHOD("Strm_CheckService", "(Landroid/DVB/Strm$ServiceCheck;)I",
                               Strm_CheckService),
};
static_assert(NELEM(gMethods) == 23, "android.DVB.Strm declares 23 natives");

}  // namespace

int Strmcallback(void*, int, int) {
    return 0;
}

int register_android_dvb_Strm(JNIEnv* env) {
    if (!dvbjni::findContextField(env, "android/DVB/Strm", "Can't find android/DVB/Strm",
                                  "Can't find Tuner.mNativeContext", &gContext)) {
        return -1;
    }
    return android::AndroidRuntime::registerNativeMethods(env, "android/DVB/Strm", gMethods,
                                                          NELEM(gMethods));
}
