// The stream module's component lists and events as the module writes them: every out-record
// is filled from the input (counts any value, texts without zero bytes, any byte sequence),
// then the natives that register_android_dvb_Strm registers run in a fuzz-chosen order, the
// cache readers at any index. While a reader runs, every byte of its cache outside the one
// entry it may read is poisoned for AddressSanitizer. A shadow of each exported cache, kept
// by the harness, must equal the cache after every call, so a write beyond a count or into a
// neighbouring entry is found even where it stays inside the array.
#include <DVB.h>
#include <fuzzer/FuzzedDataProvider.h>
#include <sanitizer/asan_interface.h>

#include <cstring>
#include <initializer_list>
#include <string>
#include <vector>

#include "FakeJni.h"
#include "Registration.h"
#include "TextReference.h"

// The library's exported caches.
extern "C" {
extern VideoContent videoContents[kStreamComponents];
extern AudioContent audioContents[kStreamComponents];
extern SubtitleContent subtitleContents[kStreamComponents];
extern TeletextContent teletextContents[kStreamComponents];
extern uint16_t caSysId[3];
extern ExtEpgEventItem EpgExtentItemNow[kExtEpgItems];
extern ExtEpgEventItem EpgExtentItemNext[kExtEpgItems];
}

namespace {

// Bytes for the module's next out-record: the input's bytes, the rest of the record filled
// on with the first of them, so that long unended text costs the fuzzer one byte.
struct Fill {
    std::vector<uint8_t> bytes;

    void into(void* record, size_t size) const {
        auto* raw = static_cast<uint8_t*>(record);
        size_t n = bytes.size() < size ? bytes.size() : size;
        if (n > 0) memcpy(raw, bytes.data(), n);
        memset(raw + n, bytes.empty() ? 0 : bytes[0], size - n);
    }
};

// What the module wrote last, kept by value for the oracle.
struct Written {
    STRM_StreamInfo info;
    EpgEvent events[2];
    ExtEpgEvent exts[2];
    STRM_Settings settings;
    STRM_GetStatus status;
    // Where the library's own records were, for the byte-array copies.
    const void* eventAt[2];
};

class FuzzStrm : public android::Strm {
public:
    int32_t Init() override { return 0; }
    int32_t Open(const STRM_OpenSettings*) override { return 0; }
    int32_t Close(int32_t) override { return 0; }
    int32_t Start(int32_t, const STRM_Settings*) override { return 0; }
    int32_t Stop(int32_t, int32_t) override { return 0; }
    int32_t GetSettings(int32_t, STRM_Settings* s) override {
        fill.into(s, sizeof *s);
        written.settings = *s;
        return 0;
    }
    int32_t SetSettings(int32_t, const STRM_Settings*) override { return 0; }
    int32_t GetStatus(int32_t, STRM_GetStatus* s) override {
        fill.into(s, sizeof *s);
        written.status = *s;
        return 0;
    }
    int32_t CreatStreamInfo(int32_t, STRM_StreamInfo* info) override {
        fill.into(info, sizeof *info);
        info->videoCount = counts[0];
        info->audioCount = counts[1];
        info->teletextCount = counts[2];
        info->subtitleCount = counts[3];
        written.info = *info;
        return 0;
    }
    int32_t GetAllEvent(int32_t, EpgEvent* present, EpgEvent* following, ExtEpgEvent* presentExt,
                        ExtEpgEvent* followingExt) override {
        event(present, 0);
        event(following, 1);
        ext(presentExt, 0);
        ext(followingExt, 1);
        return 0;
    }
    int32_t GetEvent(int32_t, EpgEvent* e) override {
        event(e, 0);
        return 0;
    }
    int32_t GetTime(int32_t, uint32_t*) override { return 0; }
    int32_t CheckService(const ServiceCheck*) override { return 0; }
    int32_t EPG_GetEvent(const EpgSvc*, int32_t, EpgEvent* e, ExtEpgEvent* x) override {
        event(e, 0);
        ext(x, 0);
        return 0;
    }
    int32_t EpgMd_AddService(const EpgSvc*) override { return 0; }
    int32_t EpgMd_ClearService() override { return 0; }

    void event(EpgEvent* e, int k) {
        fill.into(e, sizeof *e);
        written.events[k] = *e;
        written.eventAt[k] = e;
    }
    void ext(ExtEpgEvent* x, int k) {
        fill.into(x, sizeof *x);
        x->itemCount = itemCounts[k];
        written.exts[k] = *x;
    }

    Fill fill;
    int32_t counts[4] = {};
    uint32_t itemCounts[2] = {};
    Written written{};
};

using Query = jint (*)(JNIEnv*, jobject, jlong, jobject);
using ReadAt = jint (*)(JNIEnv*, jobject, jint, jobject);
using AllEvent = jint (*)(JNIEnv*, jobject, jlong, jobject, jobject, jobject, jobject);
using EpgEventFn = jint (*)(JNIEnv*, jobject, jlong, jobject, jobject, jobject);
using Settings = jint (*)(JNIEnv*, jobject, jlong, jobject, jobject, jobject, jobject);

constexpr const char* kStrm = "android/DVB/Strm";

struct Harness {
    FuzzStrm* strm;
    jint context;
    Query createInfo, getEvent, getStatus;
    ReadAt video, audio, subtitle, teletext, extNow, extNext, epgExt;
    AllEvent allEvent;
    EpgEventFn epgEvent;
    Settings settings;
};

FuzzStrm* gInstalled;

Harness& harness() {
    static Harness h = [] {
        fakejni::Env& env = fakejni::env();
        FUZZ_CHECK(register_android_dvb_Strm(env.get()) == 0 && !env.pending());
        Harness s;
        s.context = fakejni::bindDvb([](android::DVB& dvb) {
            gInstalled = new FuzzStrm;
            dvb.mStrm = gInstalled;
        });
        s.strm = gInstalled;
        auto native = [&](const char* name, const char* signature) {
            return env.native(kStrm, name, signature);
        };
        s.createInfo = reinterpret_cast<Query>(
                native("Strm_CreatStreamInfo", "(JLandroid/DVB/Strm$STRM_StreamInfo;)I"));
        s.getEvent =
                reinterpret_cast<Query>(native("Strm_GetEvent", "(JLandroid/DVB/Strm$EpgEvent;)I"));
        s.getStatus = reinterpret_cast<Query>(
                native("Strm_GetStatus", "(JLandroid/DVB/Strm$STRM_GetStatus;)I"));
        s.video = reinterpret_cast<ReadAt>(
                native("Strm_GetVideoStreamInfo", "(ILandroid/DVB/Strm$VideoContent;)I"));
        s.audio = reinterpret_cast<ReadAt>(
                native("Strm_GetAudioStreamInfo", "(ILandroid/DVB/Strm$AudioContent;)I"));
        s.subtitle = reinterpret_cast<ReadAt>(
                native("Strm_GetSubTilteStreamInfo", "(ILandroid/DVB/Strm$SubtitleContent;)I"));
        s.teletext = reinterpret_cast<ReadAt>(
                native("Strm_GetTeleTextStreamInfo", "(ILandroid/DVB/Strm$TeletextContent;)I"));
        s.extNow = reinterpret_cast<ReadAt>(
                native("Strm__GetExtEPGEventNow", "(ILandroid/DVB/Strm$ExtEpgEventItem;)I"));
        s.extNext = reinterpret_cast<ReadAt>(
                native("Strm__GetExtEPGEventNext", "(ILandroid/DVB/Strm$ExtEpgEventItem;)I"));
        s.epgExt = reinterpret_cast<ReadAt>(
                native("EPG_ExtGetEvent", "(ILandroid/DVB/Strm$ExtEpgEventItem;)I"));
        s.allEvent = reinterpret_cast<AllEvent>(
                native("Strm_GetAllEvent",
                       "(JLandroid/DVB/Strm$EpgEvent;Landroid/DVB/Strm$EpgEvent;"
                       "Landroid/DVB/Strm$ExtEpgEvent;Landroid/DVB/Strm$ExtEpgEvent;)I"));
        s.epgEvent = reinterpret_cast<EpgEventFn>(
                native("EPG_GetEvent",
                       "(JLandroid/DVB/Strm$EpgSvc;Landroid/DVB/Strm$EpgEvent;"
                       "Landroid/DVB/Strm$ExtEpgEvent;)I"));
        s.settings = reinterpret_cast<Settings>(
                native("Strm_GetSettings",
                       "(JLandroid/DVB/Strm$STRM_Service;Landroid/DVB/Strm$STRM_PvrSetting;"
                       "Landroid/DVB/Strm$STRM_LangCode;Landroid/DVB/Strm$STRM_FrontEnd;)I"));
        return s;
    }();
    return h;
}

fakejni::Env& env() {
    return fakejni::env();
}

// ---- the shadow caches -------------------------------------------------------------------

struct Shadow {
    VideoContent video[kStreamComponents];
    AudioContent audio[kStreamComponents];
    SubtitleContent subtitle[kStreamComponents];
    TeletextContent teletext[kStreamComponents];
    uint16_t ca[3];
    ExtEpgEventItem now[kExtEpgItems];
    ExtEpgEventItem next[kExtEpgItems];
};

Shadow gShadow{};  // the caches are zero at load, like this

void expectCachesAsShadow() {
    FUZZ_CHECK(memcmp(videoContents, gShadow.video, sizeof gShadow.video) == 0);
    FUZZ_CHECK(memcmp(audioContents, gShadow.audio, sizeof gShadow.audio) == 0);
    FUZZ_CHECK(memcmp(subtitleContents, gShadow.subtitle, sizeof gShadow.subtitle) == 0);
    FUZZ_CHECK(memcmp(teletextContents, gShadow.teletext, sizeof gShadow.teletext) == 0);
    FUZZ_CHECK(memcmp(caSysId, gShadow.ca, sizeof gShadow.ca) == 0);
    FUZZ_CHECK(memcmp(EpgExtentItemNow, gShadow.now, sizeof gShadow.now) == 0);
    FUZZ_CHECK(memcmp(EpgExtentItemNext, gShadow.next, sizeof gShadow.next) == 0);
}

// What Java is told for a module count: at most the room, below 1 as it is.
int32_t told(int32_t count) {
    return count > kStreamComponents ? kStreamComponents : count;
}

template <typename Entry>
void shadowCopy(Entry (&shadow)[kStreamComponents], const Entry (&list)[kStreamComponents],
                int32_t count) {
    for (int32_t i = 0; i < told(count); ++i) shadow[i] = list[i];
}

uint32_t toldItems(uint32_t count) {
    return count > static_cast<uint32_t>(kExtEpgItems) ? kExtEpgItems : count;
}

void shadowItems(ExtEpgEventItem (&shadow)[kExtEpgItems], const ExtEpgEvent& ext) {
    for (uint32_t k = 0; k < toldItems(ext.itemCount); ++k) shadow[k] = ext.items[k];
}

// ---- the oracle --------------------------------------------------------------------------

void expectInt(jobject out, const char* name, jint want) {
    const fakejni::Value* v = env().value(out, name);
    FUZZ_CHECK(v != nullptr && v->type == 'I' && v->i == want);
}

void expectLong(jobject out, const char* name, jlong want) {
    const fakejni::Value* v = env().value(out, name);
    FUZZ_CHECK(v != nullptr && v->type == 'J' && v->j == want);
}

template <size_t N>
void expectString(jobject out, const char* name, const char (&field)[N]) {
    const fakejni::Value* v = env().value(out, name);
    FUZZ_CHECK(v != nullptr && v->type == 'L' && v->object != nullptr);
    FUZZ_CHECK(v->object->kind == fakejni::Kind::String);
    FUZZ_CHECK(v->object->chars ==
               fuzzref::expectedText(reinterpret_cast<const uint8_t*>(field), N).chars);
}

template <size_t N>
void expectStringOrNull(jobject out, const char* name, const char (&field)[N]) {
    if (field[0] != '\0') return expectString(out, name, field);
    const fakejni::Value* v = env().value(out, name);
    FUZZ_CHECK(v != nullptr && v->type == 'L' && v->object == nullptr);
}

// Text that reaches Java as its bytes up to the first zero byte or the field's end.
template <size_t N>
void expectBytes(jobject out, const char* name, const char (&field)[N]) {
    const fakejni::Value* v = env().value(out, name);
    FUZZ_CHECK(v != nullptr && v->type == 'L' && v->object != nullptr);
    FUZZ_CHECK(v->object->kind == fakejni::Kind::ByteArray);
    const size_t length = strnlen(field, N);
    FUZZ_CHECK(v->object->bytes.size() == length);
    FUZZ_CHECK(length == 0 || memcmp(v->object->bytes.data(), field, length) == 0);
}

void expectThrown(jint result, const char* className, const std::string& message) {
    FUZZ_CHECK(result == -1 && env().pending());
    FUZZ_CHECK(env().exceptionClass() == className);
    FUZZ_CHECK(env().exceptionMessage() == message);
}

void expectOk(jint result) {
    FUZZ_CHECK(result == 0 && !env().pending());
}

void expectEvent(jobject out, const EpgEvent& e) {
    expectInt(out, "evtId", e.evtId);
    expectInt(out, "startTime", e.startTime);
    expectInt(out, "duration", e.duration);
    expectInt(out, "runStatus", e.runStatus);
    expectInt(out, "parentalRating", e.parentalRating);
    expectInt(out, "content", e.content);
    expectInt(out, "refSvcId", e.refSvcId);
    expectInt(out, "refEvtId", e.refEvtId);
    expectBytes(out, "name", e.name);
    expectBytes(out, "text", e.text);
    expectInt(out, "extendedFlag", e.extendedFlag);
    FUZZ_CHECK(env().setCount(out) == 11);
}

void expectExt(jobject out, const ExtEpgEvent& x) {
    expectInt(out, "itemCount", static_cast<jint>(toldItems(x.itemCount)));
    expectString(out, "text", x.text);
    FUZZ_CHECK(env().setCount(out) == 2);
}

// Every byte-array copy came from inside a name or text field of the given events.
void expectCopiesInEvents(std::initializer_list<const void*> events) {
    for (const fakejni::Copy& c : env().copies()) {
        const char* from = static_cast<const char*>(c.source);
        bool inside = false;
        for (const void* at : events) {
            const auto* e = static_cast<const EpgEvent*>(at);
            inside = inside || (from >= e->name && from + c.bytes <= e->name + sizeof e->name) ||
                     (from >= e->text && from + c.bytes <= e->text + sizeof e->text);
        }
        FUZZ_CHECK(inside);
    }
}

// ---- the cache readers -------------------------------------------------------------------

// Leaves only `entry` of the cache [base, base + size) readable (null: none of it).
void fence(const void* base, size_t size, const void* entry, size_t entrySize) {
    auto* b = static_cast<const char*>(base);
    if (entry == nullptr) {
        ASAN_POISON_MEMORY_REGION(b, size);
        return;
    }
    const char* begin = static_cast<const char*>(entry);
    const char* end = begin + entrySize;
    ASAN_POISON_MEMORY_REGION(b, static_cast<size_t>(begin - b));
    ASAN_POISON_MEMORY_REGION(end, size - static_cast<size_t>(end - b));
}

void unfence(const void* base, size_t size) {
    ASAN_UNPOISON_MEMORY_REGION(base, size);
}

jint pickIndex(FuzzedDataProvider& fdp, jint room) {
    if (fdp.ConsumeIntegralInRange(0, 3) == 0) return fdp.ConsumeIntegral<jint>();
    return fdp.ConsumeIntegralInRange<jint>(-1, room);
}

// Reads entry `index` of `cache` through `read`; false if it was refused as it must be.
template <typename Entry, size_t N>
bool readEntry(FuzzedDataProvider& fdp, ReadAt read, const char* className, Entry (&cache)[N],
               jobject* out, const Entry** entry) {
    const jint index = pickIndex(fdp, static_cast<jint>(N));
    const bool inside = index >= 0 && index < static_cast<jint>(N);
    jobject thiz = env().newInstance(kStrm);
    *out = env().newInstance(className);
    *entry = inside ? &cache[index] : nullptr;
    if (inside) env().setTextWindow(*entry, sizeof(Entry));
    fence(cache, sizeof cache, *entry, sizeof(Entry));
    jint result = read(env().get(), thiz, index, *out);
    unfence(cache, sizeof cache);
    if (!inside) {
        expectThrown(result, "java/lang/IndexOutOfBoundsException",
                     fakejni::indexMessage(index, static_cast<jint>(N)));
        FUZZ_CHECK(env().setCount(*out) == 0);
        return false;
    }
    expectOk(result);
    return true;
}

void readItem(FuzzedDataProvider& fdp, ReadAt read, ExtEpgEventItem (&cache)[kExtEpgItems]) {
    jobject out;
    const ExtEpgEventItem* e;
    if (!readEntry(fdp, read, "android/DVB/Strm$ExtEpgEventItem", cache, &out, &e)) return;
    expectStringOrNull(out, "itemDesc", e->itemDesc);
    expectStringOrNull(out, "type", e->itemText);
    FUZZ_CHECK(env().setCount(out) == 2);
}

// ---- the calls ---------------------------------------------------------------------------

void consumeFill(FuzzedDataProvider& fdp, Harness& h) {
    h.strm->fill.bytes = fdp.ConsumeBytes<uint8_t>(fdp.ConsumeIntegralInRange(0, 400));
}

// Counts near the room, and any at all.
int32_t pickCount(FuzzedDataProvider& fdp) {
    if (fdp.ConsumeBool()) return fdp.ConsumeIntegral<int32_t>();
    return fdp.ConsumeIntegralInRange<int32_t>(-2, kStreamComponents + 2);
}

uint32_t pickItemCount(FuzzedDataProvider& fdp) {
    if (fdp.ConsumeBool()) return fdp.ConsumeIntegral<uint32_t>();
    return fdp.ConsumeIntegralInRange<uint32_t>(0, kExtEpgItems + 2);
}

void createInfo(FuzzedDataProvider& fdp, Harness& h, jobject thiz) {
    for (int32_t& c : h.strm->counts) c = pickCount(fdp);
    consumeFill(fdp, h);
    jobject out = env().newInstance("android/DVB/Strm$STRM_StreamInfo");
    expectOk(h.createInfo(env().get(), thiz, fdp.ConsumeIntegral<jlong>(), out));
    const STRM_StreamInfo& w = h.strm->written.info;
    shadowCopy(gShadow.video, w.video, w.videoCount);
    shadowCopy(gShadow.audio, w.audio, w.audioCount);
    shadowCopy(gShadow.teletext, w.teletext, w.teletextCount);
    shadowCopy(gShadow.subtitle, w.subtitle, w.subtitleCount);
    memcpy(gShadow.ca, w.caSysId, sizeof gShadow.ca);
    expectInt(out, "videoCount", told(w.videoCount));
    expectInt(out, "audioCount", told(w.audioCount));
    expectInt(out, "teletextCount", told(w.teletextCount));
    expectInt(out, "subtitleCount", told(w.subtitleCount));
    expectInt(out, "pcrPid", w.pcrPid);
    expectInt(out, "caSysId0", w.caSysId[0]);
    expectInt(out, "caSysId1", w.caSysId[1]);
    expectInt(out, "caSysId2", w.caSysId[2]);
    FUZZ_CHECK(env().setCount(out) == 8);
}

void allEvent(FuzzedDataProvider& fdp, Harness& h, jobject thiz) {
    h.strm->itemCounts[0] = pickItemCount(fdp);
    h.strm->itemCounts[1] = pickItemCount(fdp);
    consumeFill(fdp, h);
    jobject now = env().newInstance("android/DVB/Strm$EpgEvent");
    jobject next = env().newInstance("android/DVB/Strm$EpgEvent");
    jobject nowExt = env().newInstance("android/DVB/Strm$ExtEpgEvent");
    jobject nextExt = env().newInstance("android/DVB/Strm$ExtEpgEvent");
    expectOk(h.allEvent(env().get(), thiz, fdp.ConsumeIntegral<jlong>(), now, next, nowExt,
                        nextExt));
    const Written& w = h.strm->written;
    shadowItems(gShadow.now, w.exts[0]);
    shadowItems(gShadow.next, w.exts[1]);
    expectEvent(now, w.events[0]);
    expectEvent(next, w.events[1]);
    expectExt(nowExt, w.exts[0]);
    expectExt(nextExt, w.exts[1]);
    expectCopiesInEvents({w.eventAt[0], w.eventAt[1]});
}

void epgEvent(FuzzedDataProvider& fdp, Harness& h, jobject thiz) {
    h.strm->itemCounts[0] = pickItemCount(fdp);
    consumeFill(fdp, h);
    jobject svc = env().newInstance("android/DVB/Strm$EpgSvc");
    jobject event = env().newInstance("android/DVB/Strm$EpgEvent");
    jobject ext = env().newInstance("android/DVB/Strm$ExtEpgEvent");
    expectOk(h.epgEvent(env().get(), thiz, fdp.ConsumeIntegral<jlong>(), svc, event, ext));
    const Written& w = h.strm->written;
    shadowItems(gShadow.now, w.exts[0]);
    expectEvent(event, w.events[0]);
    expectExt(ext, w.exts[0]);
    expectCopiesInEvents({w.eventAt[0]});
}

void getEvent(FuzzedDataProvider& fdp, Harness& h, jobject thiz) {
    consumeFill(fdp, h);
    jobject event = env().newInstance("android/DVB/Strm$EpgEvent");
    expectOk(h.getEvent(env().get(), thiz, fdp.ConsumeIntegral<jlong>(), event));
    expectEvent(event, h.strm->written.events[0]);
    expectCopiesInEvents({h.strm->written.eventAt[0]});
}

void getSettings(FuzzedDataProvider& fdp, Harness& h, jobject thiz) {
    consumeFill(fdp, h);
    jobject service = env().newInstance("android/DVB/Strm$STRM_Service");
    jobject pvr = env().newInstance("android/DVB/Strm$STRM_PvrSetting");
    jobject lang = env().newInstance("android/DVB/Strm$STRM_LangCode");
    jobject fe = env().newInstance("android/DVB/Strm$STRM_FrontEnd");
    expectOk(h.settings(env().get(), thiz, fdp.ConsumeIntegral<jlong>(), service, pvr, lang, fe));
    const STRM_Settings& s = h.strm->written.settings;
    expectString(lang, "langCode0", s.langCode0);
    expectString(lang, "langCode1", s.langCode1);
    FUZZ_CHECK(env().setCount(lang) == 2);
    expectInt(service, "svcId", s.svcId);
    expectInt(service, "caSysId2", s.caSysId2);
    expectInt(service, "tsIndex", s.tsIndex);
    FUZZ_CHECK(env().setCount(service) == 11);
    expectInt(pvr, "playSpeed", s.playSpeed);
    expectInt(pvr, "posTime", s.posTime);
    FUZZ_CHECK(env().setCount(pvr) == 3);
    expectInt(fe, "frequency", s.fe.frequency);
    expectInt(fe, "orbital_position", s.orbital_position);
    expectInt(fe, "out5v", s.fe.out5v);
    FUZZ_CHECK(env().setCount(fe) == 23);
}

void getStatus(FuzzedDataProvider& fdp, Harness& h, jobject thiz) {
    consumeFill(fdp, h);
    jobject status = env().newInstance("android/DVB/Strm$STRM_GetStatus");
    expectOk(h.getStatus(env().get(), thiz, fdp.ConsumeIntegral<jlong>(), status));
    const STRM_GetStatus& s = h.strm->written.status;
    expectInt(status, "feStatus", s.feStatus);
    expectLong(status, "recsize", s.recsize);
    expectInt(status, "recendTime", s.recendTime);
    expectInt(status, "pbevent", s.pbevent);
    expectInt(status, "result", s.result);
    FUZZ_CHECK(env().setCount(status) == 23);
}

void callOnce(FuzzedDataProvider& fdp, Harness& h) {
    enum {
        kVideo,
        kAudio,
        kSubtitle,
        kTeletext,
        kAllEvent,
        kExtNow,
        kExtNext,
        kEpgExt,
        kGetEvent,
        kEpgEvent,
        kSettings,
        kStatus,
        kCreateInfo,
        kOps
    };
    const int op = fdp.ConsumeIntegralInRange(0, kOps - 1);
    env().reset();
    jobject thiz = env().newInstance(kStrm);
    jobject out;
    switch (op) {
        case kVideo: {
            const VideoContent* e;
            if (!readEntry(fdp, h.video, "android/DVB/Strm$VideoContent", videoContents, &out,
                           &e)) {
                break;
            }
            expectInt(out, "pid", e->pid);
            expectInt(out, "type", e->type);
            FUZZ_CHECK(env().setCount(out) == 2);
            break;
        }
        case kAudio: {
            const AudioContent* e;
            if (!readEntry(fdp, h.audio, "android/DVB/Strm$AudioContent", audioContents, &out,
                           &e)) {
                break;
            }
            expectInt(out, "pid", e->pid);
            expectInt(out, "isDolbyAC3", e->isDolbyAC3);
            expectInt(out, "type", e->type);
            expectString(out, "langCode0", e->langCode0);
            expectString(out, "langCode1", e->langCode1);
            expectInt(out, "componetTag", e->componetTag);
            expectString(out, "streamName", e->streamName);
            FUZZ_CHECK(env().setCount(out) == 7);
            break;
        }
        case kSubtitle: {
            const SubtitleContent* e;
            if (!readEntry(fdp, h.subtitle, "android/DVB/Strm$SubtitleContent", subtitleContents,
                           &out, &e)) {
                break;
            }
            expectInt(out, "pid", e->pid);
            expectString(out, "langCode", e->langCode);
            expectInt(out, "ancillaryPageId", e->ancillaryPageId);
            FUZZ_CHECK(env().setCount(out) == 7);
            break;
        }
        case kTeletext: {
            const TeletextContent* e;
            if (!readEntry(fdp, h.teletext, "android/DVB/Strm$TeletextContent", teletextContents,
                           &out, &e)) {
                break;
            }
            expectInt(out, "pid", e->pid);
            expectString(out, "langCode", e->langCode);
            expectInt(out, "pageNumber", e->pageNumber);
            expectString(out, "streamName", e->streamName);
            FUZZ_CHECK(env().setCount(out) == 7);
            break;
        }
        case kAllEvent:
            allEvent(fdp, h, thiz);
            break;
        case kExtNow:
            readItem(fdp, h.extNow, EpgExtentItemNow);
            break;
        case kExtNext:
            readItem(fdp, h.extNext, EpgExtentItemNext);
            break;
        case kEpgExt:
            readItem(fdp, h.epgExt, EpgExtentItemNow);
            break;
        case kGetEvent:
            getEvent(fdp, h, thiz);
            break;
        case kEpgEvent:
            epgEvent(fdp, h, thiz);
            break;
        case kSettings:
            getSettings(fdp, h, thiz);
            break;
        case kStatus:
            getStatus(fdp, h, thiz);
            break;
        case kCreateInfo:
            createInfo(fdp, h, thiz);
            break;
    }
    expectCachesAsShadow();
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    Harness& h = harness();
    FuzzedDataProvider fdp(data, size);
    env().reset();
    env().setContext(h.context);
    // Every input starts with a component query, then any calls.
    createInfo(fdp, h, env().newInstance(kStrm));
    expectCachesAsShadow();
    const int calls = fdp.ConsumeIntegralInRange(1, 12);
    for (int i = 0; i < calls; ++i) callOnce(fdp, h);
    return 0;
}
