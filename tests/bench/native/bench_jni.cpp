// The benchmark's own native library: the empty native call, hand-written minimal twins of a
// few library methods (the same look-ups, field accesses and copies, with no abstraction),
// bulk baselines, and the spy controls the benchmark needs.
#include <DVB.h>
#include <nativehelper/JNIHelp.h>
#include <nativehelper/jni_macros.h>
#include <spy/Spy.h>

#include <cstdlib>
#include <cstring>
#include <new>

// The library's exported caches and display-data buffer.
extern SCNM_ServiceInfo s_SvcExt[100];
extern AudioContent audioContents[16];
extern SUBTTL_Data Data;

namespace {

android::DVB* gDvb;  // the benchmark's bound DVB object
jfieldID gCfgContext, gStrmContext, gScnmContext, gSubttlContext, gTeltxtContext;

// The frame as the twins do it: the context read, the object's lock taken and released, a
// strong reference to the module.
template <typename M>
android::sp<M> module(JNIEnv* env, jobject thiz, jfieldID field, android::sp<M> android::DVB::*m) {
    if (env->GetIntField(thiz, field) == 0) return nullptr;
    pthread_mutex_lock(&gDvb->mLock);
    pthread_mutex_unlock(&gDvb->mLock);
    return gDvb->*m;
}

void Bench_init(JNIEnv* env, jclass) {
    auto live = dvbsvc::liveDvbs();
    gDvb = live.empty() ? nullptr : live.back().get();
    const char* classes[] = {"android/DVB/Cfg", "android/DVB/Strm", "android/DVB/Scnm",
                             "android/DVB/Subttl", "android/DVB/Teltxt"};
    jfieldID* fields[] = {&gCfgContext, &gStrmContext, &gScnmContext, &gSubttlContext,
                          &gTeltxtContext};
    for (int i = 0; i < 5; ++i) {
        jclass c = env->FindClass(classes[i]);
        *fields[i] = env->GetFieldID(c, "mNativeContext", "I");
        env->DeleteLocalRef(c);
    }
}

void Bench_quiet(JNIEnv*, jclass, jboolean on) {
    dvbspy::setQuiet(on);
}

jint Bench_empty(JNIEnv*, jclass, jobject) {
    return 0;
}

void Bench_raise(JNIEnv*, jclass, jint count, jint threads) {
    dvbspy::raiseEvents(1, 2, 3, count, threads);
}

// Realistic content for the readers: a named service, an audio track with languages, and
// colour tables of visible, partly transparent colours.
void Bench_fillCaches(JNIEnv*, jclass) {
    uint32_t seed = 12345;
    auto next = [&seed] { return (seed = seed * 1103515245u + 12345u) >> 16; };
    for (SUBTTL_Clut* clut : {&Data.cluts[0], &Data.defaultClut}) {
        SUBTTL_ClutEntry* tables[] = {clut->c_2b, clut->c_4b, clut->c_8b};
        int sizes[] = {4, 16, 256};
        for (int t = 0; t < 3; ++t) {
            for (int i = 0; i < sizes[t]; ++i) {
                tables[t][i] = {static_cast<uint8_t>(16 + next() % 220),
                                static_cast<uint8_t>(next()), static_cast<uint8_t>(next()),
                                static_cast<uint8_t>(next() % 4 == 0 ? 128 : 0)};
            }
        }
    }
    strcpy(s_SvcExt[0].svcName, "Das Erste HD");
    s_SvcExt[0].svcId = 0x283D;
    strcpy(audioContents[0].langCode0, "deu");
    strcpy(audioContents[0].langCode1, "mis");
    strcpy(audioContents[0].streamName, "Stereo");
}

void Bench_setRegion(JNIEnv*, jclass, jint r, jint width, jint height) {
    Data.regions[r].i_width = width;
    Data.regions[r].i_height = height;
}

// ---- twins --------------------------------------------------------------------------------

jint twinCfgTune(JNIEnv* env, jclass, jobject thiz, jint dev, jobject p) {
    android::sp<android::Cfg> cfg = module(env, thiz, gCfgContext, &android::DVB::mCfg);
    if (cfg == nullptr) return -1;
    jclass c = env->FindClass("android/DVB/Cfg$ANT_FrontendParameters");
    static const char* const names[24] = {
            "type",      "frequency",  "symbolRate", "fecInner",    "modulation",  "polarization",
            "rolloff",   "diseqctype", "tone",       "lnbpower",    "lnbLowLO",    "lnbHigLO",
            "port",      "port16",     "posIndex",   "satPosition", "myLongitude", "myLatitude",
            "toneBurst", "ubSlot",     "ubFreq",     "ubSat",       "out5v",       "bandwidth"};
    jfieldID ids[24];
    for (int i = 0; i < 24; ++i) ids[i] = env->GetFieldID(c, names[i], "I");
    jint v[24];
    for (int i = 0; i < 24; ++i) v[i] = env->GetIntField(p, ids[i]);
    env->DeleteLocalRef(c);
    ANT_FrontendParameters rec{};
    rec.type = v[0] == 1 ? 1 : v[0] == 2 ? 2 : 0;
    rec.frequency = v[1];
    if (rec.type == 2) {
        rec.bandwidth = v[23];
    } else {
        rec.symbolRate = v[2];
        rec.fecInner = v[3];
        rec.modulation = v[4];
        if (rec.type == 0) {
            rec.polarization = v[5];
            rec.rolloff = v[6];
        }
    }
    rec.diseqctype = v[7];
    rec.tone = v[8];
    rec.lnbpower = v[9];
    rec.lnbLowLO = v[10];
    rec.lnbHigLO = v[11];
    rec.port = v[12];
    rec.port16 = v[13];
    rec.posIndex = v[14];
    rec.satPosition = v[15];
    rec.myLongitude = v[16];
    rec.myLatitude = v[17];
    rec.toneBurst = v[18];
    rec.ubSlot = v[19];
    rec.ubFreq = v[20];
    rec.ubSat = v[21];
    rec.out5v = v[22];
    return cfg->Tune(dev, &rec);
}

jint twinCfgGetStatus(JNIEnv* env, jclass, jobject thiz, jint dev, jobject s) {
    android::sp<android::Cfg> cfg = module(env, thiz, gCfgContext, &android::DVB::mCfg);
    if (cfg == nullptr) return -1;
    ANT_Status rec{};
    cfg->GetStatus(dev, &rec);
    jclass c = env->FindClass("android/DVB/Cfg$ANT_Status");
    jfieldID a = env->GetFieldID(c, "feStatus", "I");
    jfieldID b = env->GetFieldID(c, "strength", "I");
    jfieldID q = env->GetFieldID(c, "quality", "I");
    env->SetIntField(s, a, rec.feStatus);
    env->SetIntField(s, b, rec.strength);
    env->SetIntField(s, q, rec.quality);
    env->DeleteLocalRef(c);
    return 0;
}

void copyLang(JNIEnv* env, jstring s, char* dst) {
    const char* chars = env->GetStringUTFChars(s, nullptr);
    size_t n = strlen(chars);
    memcpy(dst, chars, n < 3 ? n : 3);
    env->ReleaseStringUTFChars(s, chars);
}

jint twinStrmStart(JNIEnv* env, jclass, jobject thiz, jlong h, jobject svc, jobject lang,
                   jobject fe) {
    android::sp<android::Strm> strm = module(env, thiz, gStrmContext, &android::DVB::mStrm);
    if (strm == nullptr) return -1;
    static const char* const feNames[25] = {
            "type",        "frequency",    "symbolRate", "fecInner",
            "modulation",  "polarization", "rolloff",    "orbital_position",
            "diseqctype",  "tone",         "lnbpower",   "lnbLowLO",
            "lnbHigLO",    "port",         "port16",     "posIndex",
            "satPosition", "myLongitude",  "myLatitude", "toneBurst",
            "ubSlot",      "ubFreq",       "ubSat",      "out5v",
            "bandwidth"};
    static const char* const svcNames[11] = {"svcId",     "videoPid", "videoType", "audioPid",
                                             "audioType", "pcrPid",   "pmtPid",    "caSysId0",
                                             "caSysId1",  "caSysId2", "tsIndex"};
    jclass c = env->FindClass("android/DVB/Strm$STRM_FrontEnd");
    jfieldID ids[25];
    jint f[25];
    for (int i = 0; i < 25; ++i) ids[i] = env->GetFieldID(c, feNames[i], "I");
    for (int i = 0; i < 25; ++i) f[i] = env->GetIntField(fe, ids[i]);
    env->DeleteLocalRef(c);
    c = env->FindClass("android/DVB/Strm$STRM_Service");
    jint sv[11];
    for (int i = 0; i < 11; ++i) ids[i] = env->GetFieldID(c, svcNames[i], "I");
    for (int i = 0; i < 11; ++i) sv[i] = env->GetIntField(svc, ids[i]);
    env->DeleteLocalRef(c);
    c = env->FindClass("android/DVB/Strm$STRM_LangCode");
    jfieldID l0 = env->GetFieldID(c, "langCode0", "Ljava/lang/String;");
    jfieldID l1 = env->GetFieldID(c, "langCode1", "Ljava/lang/String;");
    auto s0 = static_cast<jstring>(env->GetObjectField(lang, l0));
    auto s1 = static_cast<jstring>(env->GetObjectField(lang, l1));
    env->DeleteLocalRef(c);
    STRM_Settings rec{};
    ANT_FrontendParameters& b = rec.fe;
    b.type = f[0] == 1 ? 1 : f[0] == 2 ? 2 : 0;
    b.frequency = f[1];
    if (b.type == 2) {
        b.bandwidth = f[24];
    } else {
        b.symbolRate = f[2];
        b.fecInner = f[3];
        b.modulation = f[4];
        if (b.type == 0) {
            b.polarization = f[5];
            b.rolloff = f[6];
        }
    }
    b.diseqctype = f[8];
    b.tone = f[9];
    b.lnbpower = f[10];
    b.lnbLowLO = f[11];
    b.lnbHigLO = f[12];
    b.port = f[13];
    b.port16 = f[14];
    b.posIndex = f[15];
    b.satPosition = f[16];
    b.myLongitude = f[17];
    b.myLatitude = f[18];
    b.toneBurst = f[19];
    b.ubSlot = f[20];
    b.ubFreq = f[21];
    b.ubSat = f[22];
    b.out5v = f[23];
    rec.orbital_position = static_cast<int16_t>(f[7]);
    rec.svcId = sv[0];
    rec.videoPid = sv[1];
    rec.videoType = sv[2];
    rec.audioPid = sv[3];
    rec.audioType = sv[4];
    rec.pcrPid = sv[5];
    rec.pmtPid = sv[6];
    rec.caSysId0 = sv[7];
    rec.caSysId1 = sv[8];
    rec.caSysId2 = sv[9];
    rec.tsIndex = sv[10];
    copyLang(env, s0, rec.langCode0);
    copyLang(env, s1, rec.langCode1);
    env->DeleteLocalRef(s0);
    env->DeleteLocalRef(s1);
    return strm->Start(static_cast<int32_t>(h), &rec);
}

jint twinStrmGetStatus(JNIEnv* env, jclass, jobject thiz, jlong h, jobject s) {
    android::sp<android::Strm> strm = module(env, thiz, gStrmContext, &android::DVB::mStrm);
    if (strm == nullptr) return -1;
    STRM_GetStatus rec{};
    strm->GetStatus(static_cast<int32_t>(h), &rec);
    static const char* const names[23] = {
            "feStatus",   "feStrength",  "feBer",      "feSnr",      "videoPts",
            "audioPts",   "localPts",    "fpsInteger", "fpsDecimal", "pictureStatus",
            "recstate",   "recduration", "recsize",    "recevent",   "recstartTime",
            "reccurTime", "recendTime",  "pbstate",    "pbposition", "pbstartTime",
            "pbendTime",  "pbevent",     "result"};
    const int32_t values[23] = {rec.feStatus,
                                rec.feStrength,
                                rec.feBer,
                                rec.feSnr,
                                rec.videoPts,
                                rec.audioPts,
                                rec.localPts,
                                rec.fpsInteger,
                                rec.fpsDecimal,
                                rec.pictureStatus,
                                rec.recstate,
                                rec.recduration,
                                0,
                                rec.recevent,
                                rec.recstartTime,
                                rec.reccurTime,
                                rec.recendTime,
                                rec.pbstate,
                                rec.pbposition,
                                rec.pbstartTime,
                                rec.pbendTime,
                                rec.pbevent,
                                rec.result};
    jclass c = env->FindClass("android/DVB/Strm$STRM_GetStatus");
    jfieldID ids[23];
    for (int i = 0; i < 23; ++i) ids[i] = env->GetFieldID(c, names[i], i == 12 ? "J" : "I");
    for (int i = 0; i < 23; ++i) {
        if (i == 12) {
            env->SetLongField(s, ids[i], rec.recsize);
        } else {
            env->SetIntField(s, ids[i], values[i]);
        }
    }
    env->DeleteLocalRef(c);
    return 0;
}

void setString(JNIEnv* env, jobject o, jfieldID id, const char* field, size_t width) {
    char copy[64];
    size_t n = strnlen(field, width);
    memcpy(copy, field, n);
    copy[n] = '\0';
    jstring s = env->NewStringUTF(copy);
    env->SetObjectField(o, id, s);
    env->DeleteLocalRef(s);
}

jint twinStrmGetAudioStreamInfo(JNIEnv* env, jclass, jobject thiz, jint i, jobject a) {
    android::sp<android::Strm> strm = module(env, thiz, gStrmContext, &android::DVB::mStrm);
    if (strm == nullptr) return -1;
    if (i < 0 || i >= 16) return -1;
    jclass c = env->FindClass("android/DVB/Strm$AudioContent");
    jfieldID pid = env->GetFieldID(c, "pid", "I");
    jfieldID dolby = env->GetFieldID(c, "isDolbyAC3", "I");
    jfieldID type = env->GetFieldID(c, "type", "I");
    jfieldID l0 = env->GetFieldID(c, "langCode0", "Ljava/lang/String;");
    jfieldID l1 = env->GetFieldID(c, "langCode1", "Ljava/lang/String;");
    jfieldID tag = env->GetFieldID(c, "componetTag", "I");
    jfieldID name = env->GetFieldID(c, "streamName", "Ljava/lang/String;");
    const AudioContent& e = audioContents[i];
    env->SetIntField(a, pid, e.pid);
    env->SetIntField(a, dolby, e.isDolbyAC3);
    env->SetIntField(a, type, e.type);
    setString(env, a, l0, e.langCode0, 4);
    setString(env, a, l1, e.langCode1, 4);
    env->SetIntField(a, tag, e.componetTag);
    setString(env, a, name, e.streamName, 33);
    env->DeleteLocalRef(c);
    return 0;
}

jint twinScnmGetServiceList(JNIEnv* env, jclass, jobject thiz, jint i, jobject info) {
    android::sp<android::Scnm> scnm = module(env, thiz, gScnmContext, &android::DVB::mScnm);
    if (scnm == nullptr) return -1;
    if (i < 0 || i >= 100) return -1;
    static const char* const names[15] = {"svcType",  "svcId",     "videoPid", "videoType",
                                          "audioPid", "audioType", "pcrPid",   "pmtPid",
                                          "tsId",     "onId",      "lcn",      "content",
                                          "caSysId0", "caSysId1",  "caSysId2"};
    const SCNM_ServiceInfo& e = s_SvcExt[i];
    const jint values[15] = {e.svcType,   e.svcId,   e.videoPid, e.videoType, e.audioPid,
                             e.audioType, e.pcrPid,  e.pmtPid,   e.tsId,      e.onId,
                             0,           e.content, e.caSysId0, e.caSysId1,  e.caSysId2};
    jclass c = env->FindClass("android/DVB/Scnm$SCNM_ServiceInfo");
    jfieldID ids[16];
    for (int k = 0; k < 15; ++k) ids[k] = env->GetFieldID(c, names[k], k == 10 ? "J" : "I");
    ids[15] = env->GetFieldID(c, "svcName", "[B");
    jsize n = static_cast<jsize>(strnlen(e.svcName, sizeof e.svcName));
    jbyteArray name = env->NewByteArray(n);
    env->SetByteArrayRegion(name, 0, n, reinterpret_cast<const jbyte*>(e.svcName));
    for (int k = 0; k < 15; ++k) {
        if (k == 10) {
            env->SetLongField(info, ids[k], static_cast<jlong>(e.lcn));
        } else {
            env->SetIntField(info, ids[k], values[k]);
        }
    }
    env->SetObjectField(info, ids[15], name);
    env->DeleteLocalRef(name);
    env->DeleteLocalRef(c);
    return 0;
}

inline int clamp255(int v) {
    return v < 0 ? 0 : v > 255 ? 255 : v;
}

inline jint argb(const SUBTTL_ClutEntry& e) {
    if (e.y == 0) return 0;
    int r = clamp255((1164 * e.y + 1596 * e.cr - 222912) / 1000);
    int g = clamp255((1164 * e.y - 813 * e.cr - 392 * e.cb + 135616) / 1000);
    int b = clamp255((1164 * e.y + 2017 * e.cb - 276800) / 1000);
    return static_cast<jint>((static_cast<uint32_t>(255 - e.t) << 24) | (r << 16) | (g << 8) | b);
}

void setColours(JNIEnv* env, jobject o, jfieldID id, const SUBTTL_ClutEntry* e, int n) {
    jint colours[256];
    for (int i = 0; i < n; ++i) colours[i] = argb(e[i]);
    jintArray a = env->NewIntArray(n);
    env->SetIntArrayRegion(a, 0, n, colours);
    env->SetObjectField(o, id, a);
    env->DeleteLocalRef(a);
}

jint twinSubttlGetClutData(JNIEnv* env, jclass, jobject thiz, jint i, jobject clut) {
    android::sp<android::Subttl> st = module(env, thiz, gSubttlContext, &android::DVB::mSubttl);
    if (st == nullptr) return -1;
    if (i < 0 || i >= kSubttlCluts) return -1;
    jclass c = env->FindClass("android/DVB/Subttl$SUBTTL_Clut");
    jfieldID id = env->GetFieldID(c, "i_id", "I");
    jfieldID ver = env->GetFieldID(c, "i_version", "I");
    jfieldID c2 = env->GetFieldID(c, "c_2b", "[I");
    jfieldID c4 = env->GetFieldID(c, "c_4b", "[I");
    jfieldID c8 = env->GetFieldID(c, "c_8b", "[I");
    const SUBTTL_Clut& k = Data.cluts[i];
    env->SetIntField(clut, id, k.i_id);
    env->SetIntField(clut, ver, k.i_version);
    setColours(env, clut, c2, k.c_2b, 4);
    setColours(env, clut, c4, k.c_4b, 16);
    setColours(env, clut, c8, k.c_8b, 256);
    env->DeleteLocalRef(c);
    return 0;
}

jint twinSubttlGetRegionData(JNIEnv* env, jclass, jobject thiz, jint r, jobject region) {
    android::sp<android::Subttl> st = module(env, thiz, gSubttlContext, &android::DVB::mSubttl);
    if (st == nullptr) return -1;
    if (r < 0 || r >= kSubttlRegions) return -1;
    static const char* const names[9] = {"i_id",     "i_version",    "i_x",     "i_y",   "i_width",
                                         "i_height", "i_level_comp", "i_depth", "i_clut"};
    jclass c = env->FindClass("android/DVB/Subttl$SUBTTL_Region_t");
    jfieldID ids[11];
    for (int k = 0; k < 9; ++k) ids[k] = env->GetFieldID(c, names[k], "I");
    ids[9] = env->GetFieldID(c, "p_pixbuf", "[B");
    ids[10] = env->GetFieldID(c, "i_object_defs", "I");
    const SUBTTL_Region_t& e = Data.regions[r];
    const int32_t* words = &e.i_id;
    for (int k = 0; k < 9; ++k) env->SetIntField(region, ids[k], words[k]);
    int64_t n = int64_t{e.i_width} * e.i_height;
    if (n < 0 || n > kSubttlRegionPixels) n = 0;
    jbyteArray pixels = env->NewByteArray(static_cast<jsize>(n));
    env->SetByteArrayRegion(pixels, 0, static_cast<jsize>(n),
                            reinterpret_cast<const jbyte*>(e.p_pixbuf));
    env->SetObjectField(region, ids[9], pixels);
    env->DeleteLocalRef(pixels);
    env->SetIntField(region, ids[10], e.i_object_defs);
    env->DeleteLocalRef(c);
    return 0;
}

jint twinTeltxtGetData(JNIEnv* env, jclass, jobject thiz, jlong h, jint start, jint count,
                       jbyteArray data) {
    android::sp<android::Teltxt> tt = module(env, thiz, gTeltxtContext, &android::DVB::mTeltxt);
    if (tt == nullptr) return -1;
    auto* buffer = static_cast<uint8_t*>(malloc(count > 0 ? count : 1));
    for (int32_t offset = 0; offset < count; offset += kTeltxtChunk) {
        int32_t n = count - offset < kTeltxtChunk ? count - offset : kTeltxtChunk;
        tt->GetData(static_cast<int32_t>(h), offset, n, buffer + offset);
    }
    env->SetByteArrayRegion(data, start, count, reinterpret_cast<const jbyte*>(buffer));
    free(buffer);
    return 0;
}

// ---- bulk baselines -----------------------------------------------------------------------

uint8_t gSource[4 << 20];

jint Bench_plainRegion(JNIEnv* env, jclass, jbyteArray data, jint count) {
    env->SetByteArrayRegion(data, 0, count, reinterpret_cast<const jbyte*>(gSource));
    return 0;
}

// The same buffer that Subttl_GetData clears, so that both pay the same memory.
jint Bench_bareClear(JNIEnv*, jclass) {
    memset(&Data, 0, sizeof Data);
    return reinterpret_cast<volatile uint8_t*>(&Data)[12345];
}

const JNINativeMethod gMethods[] = {
        MAKE_JNI_NATIVE_METHOD("init", "()V", Bench_init),
        MAKE_JNI_NATIVE_METHOD("quiet", "(Z)V", Bench_quiet),
        MAKE_JNI_NATIVE_METHOD("empty", "(Ljava/lang/Object;)I", Bench_empty),
        MAKE_JNI_NATIVE_METHOD("raise", "(II)V", Bench_raise),
        MAKE_JNI_NATIVE_METHOD("fillCaches", "()V", Bench_fillCaches),
        MAKE_JNI_NATIVE_METHOD("setRegion", "(III)V", Bench_setRegion),
        MAKE_JNI_NATIVE_METHOD("plainRegion", "([BI)I", Bench_plainRegion),
        MAKE_JNI_NATIVE_METHOD("bareClear", "()I", Bench_bareClear),
        MAKE_JNI_NATIVE_METHOD("twinCfgTune",
                               "(Landroid/DVB/Cfg;ILandroid/DVB/Cfg$ANT_FrontendParameters;)I",
                               twinCfgTune),
        MAKE_JNI_NATIVE_METHOD("twinCfgGetStatus",
                               "(Landroid/DVB/Cfg;ILandroid/DVB/Cfg$ANT_Status;)I",
                               twinCfgGetStatus),
        MAKE_JNI_NATIVE_METHOD("twinStrmStart",
                               "(Landroid/DVB/Strm;JLandroid/DVB/Strm$STRM_Service;"
                               "Landroid/DVB/Strm$STRM_LangCode;Landroid/DVB/Strm$STRM_FrontEnd;)I",
                               twinStrmStart),
        MAKE_JNI_NATIVE_METHOD("twinStrmGetStatus",
                               "(Landroid/DVB/Strm;JLandroid/DVB/Strm$STRM_GetStatus;)I",
                               twinStrmGetStatus),
        MAKE_JNI_NATIVE_METHOD("twinStrmGetAudioStreamInfo",
                               "(Landroid/DVB/Strm;ILandroid/DVB/Strm$AudioContent;)I",
                               twinStrmGetAudioStreamInfo),
        MAKE_JNI_NATIVE_METHOD("twinScnmGetServiceList",
                               "(Landroid/DVB/Scnm;ILandroid/DVB/Scnm$SCNM_ServiceInfo;)I",
                               twinScnmGetServiceList),
        MAKE_JNI_NATIVE_METHOD("twinSubttlGetClutData",
                               "(Landroid/DVB/Subttl;ILandroid/DVB/Subttl$SUBTTL_Clut;)I",
                               twinSubttlGetClutData),
        MAKE_JNI_NATIVE_METHOD("twinSubttlGetRegionData",
                               "(Landroid/DVB/Subttl;ILandroid/DVB/Subttl$SUBTTL_Region_t;)I",
                               twinSubttlGetRegionData),
        MAKE_JNI_NATIVE_METHOD("twinTeltxtGetData", "(Landroid/DVB/Teltxt;JII[B)I",
                               twinTeltxtGetData),
};

}  // namespace

jint JNI_OnLoad(JavaVM* vm, void*) {
    // The suites measure the library against the spy's exact behaviour, whatever the
    // substitute service's default.
    dvbsvc::setBackend(&dvbspy::backend());
    JNIEnv* env = nullptr;
    if (vm->GetEnv(reinterpret_cast<void**>(&env), JNI_VERSION_1_4) != JNI_OK) return -1;
    jclass c = env->FindClass("android/DVB/Bench");
    if (c == nullptr || env->RegisterNatives(c, gMethods, NELEM(gMethods)) != JNI_OK) return -1;
    env->DeleteLocalRef(c);
    return JNI_VERSION_1_4;
}
