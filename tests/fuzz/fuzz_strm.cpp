// The stream module's records as the module writes them: every out-record filled from the
// input (component and item counts any value, texts without zero bytes, any bytes), through
// every native that register_android_dvb_Strm registers, the cache readers at any index.
#include "Harness.h"
#include "Registration.h"

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

// A component count: what fits in the cache is copied, and Java is told that number (a count
// below 1 as it is).
template <typename T>
void components(const T (&list)[kStreamComponents], int32_t* count, int32_t* told,
                T (&cache)[kStreamComponents]) {
    FuzzedDataProvider& in = *fuzz::now.input;
    *count = in.ConsumeBool() ? in.ConsumeIntegral<int32_t>() : in.ConsumeIntegralInRange(-2, 18);
    *told = std::min(*count, kStreamComponents);
    std::copy(list, list + std::clamp(*count, 0, kStreamComponents), fuzz::shadow(cache));
}

// An extended event's items likewise, up to 16.
void items(ExtEpgEvent* x, ExtEpgEventItem (&cache)[kExtEpgItems]) {
    FuzzedDataProvider& in = *fuzz::now.input;
    ExtEpgEvent& seen = fuzz::fill(x);
    x->itemCount =
            in.ConsumeBool() ? in.ConsumeIntegral<uint32_t>() : in.ConsumeIntegralInRange(0, 18);
    seen.itemCount = std::min<uint32_t>(x->itemCount, kExtEpgItems);
    std::copy(x->items, x->items + seen.itemCount, fuzz::shadow(cache));
}

class FuzzStrm : public android::Strm {
public:
    int32_t Init() override { return fuzz::op(); }
    int32_t Open(const STRM_OpenSettings*) override { return fuzz::op(); }
    int32_t Close(int32_t) override { return fuzz::op(); }
    int32_t Start(int32_t, const STRM_Settings*) override { return fuzz::op(); }
    int32_t Stop(int32_t, int32_t) override { return fuzz::op(); }
    int32_t GetSettings(int32_t, STRM_Settings* s) override { return (fuzz::fill(s), 0); }
    int32_t SetSettings(int32_t, const STRM_Settings*) override { return fuzz::op(); }
    int32_t GetStatus(int32_t, STRM_GetStatus* s) override { return (fuzz::fill(s), 0); }
    int32_t CreatStreamInfo(int32_t, STRM_StreamInfo* info) override {
        STRM_StreamInfo& seen = fuzz::fill(info);
        components(info->video, &info->videoCount, &seen.videoCount, videoContents);
        components(info->audio, &info->audioCount, &seen.audioCount, audioContents);
        components(info->teletext, &info->teletextCount, &seen.teletextCount, teletextContents);
        components(info->subtitle, &info->subtitleCount, &seen.subtitleCount, subtitleContents);
        std::copy(info->caSysId, info->caSysId + 3, fuzz::shadow(caSysId));
        return 0;
    }
    int32_t GetAllEvent(int32_t, EpgEvent* present, EpgEvent* following, ExtEpgEvent* presentExt,
                        ExtEpgEvent* followingExt) override {
        fuzz::fill(present), fuzz::fill(following);
        items(presentExt, EpgExtentItemNow), items(followingExt, EpgExtentItemNext);
        return 0;
    }
    int32_t GetEvent(int32_t, EpgEvent* e) override { return (fuzz::fill(e), 0); }
    int32_t GetTime(int32_t, uint32_t* time) override {
        fuzz::now.want = *time = fuzz::now.input->ConsumeIntegral<uint32_t>();  // zero-extended
        return fuzz::op();
    }
    int32_t CheckService(const ServiceCheck*) override { return fuzz::op(); }
    int32_t EPG_GetEvent(const EpgSvc*, int32_t, EpgEvent* e, ExtEpgEvent* x) override {
        fuzz::fill(e), items(x, EpgExtentItemNow);
        return 0;
    }
    int32_t EpgMd_AddService(const EpgSvc*) override { return fuzz::op(); }
    int32_t EpgMd_ClearService() override { return fuzz::op(); }
};

// Four classes share the settings record; an event item's text reaches Java as `type`.
fuzz::Mapping mapping() {
    fuzz::Mapping m;
    m.counts = {{"STRM_Service", 11},   {"STRM_PvrSetting", 3}, {"STRM_LangCode", 2},
                {"STRM_FrontEnd", 23},  {"STRM_GetStatus", 23}, {"STRM_StreamInfo", 8},
                {"VideoContent", 2},    {"AudioContent", 7},    {"SubtitleContent", 7},
                {"TeletextContent", 7}, {"EpgEvent", 11},       {"ExtEpgEvent", 2},
                {"ExtEpgEventItem", 2}};
    for (const char* cls : {"STRM_Service", "STRM_PvrSetting", "STRM_LangCode", "STRM_FrontEnd"}) {
        m.records[cls] = "STRM_Settings";
    }
    m.renamed["ExtEpgEventItem.type"] = "itemText";
    m.nullable = {"ExtEpgEventItem.itemDesc", "ExtEpgEventItem.type"};
    return m;
}

const fuzz::Target& target() {
    static const fuzz::Target t(
            register_android_dvb_Strm, [](android::DVB& dvb) { dvb.mStrm = new FuzzStrm; },
            mapping(),
            {fuzz::cacheReader<videoContents>("Strm_GetVideoStreamInfo"),
             fuzz::cacheReader<audioContents>("Strm_GetAudioStreamInfo"),
             fuzz::cacheReader<subtitleContents>("Strm_GetSubTilteStreamInfo"),
             fuzz::cacheReader<teletextContents>("Strm_GetTeleTextStreamInfo"),
             fuzz::cacheReader<EpgExtentItemNow>("Strm__GetExtEPGEventNow"),
             fuzz::cacheReader<EpgExtentItemNext>("Strm__GetExtEPGEventNext"),
             fuzz::cacheReader<EpgExtentItemNow>("EPG_ExtGetEvent")},
            false);
    return t;
}

}  // namespace

// Each input starts from empty caches with a component query, then any calls.
extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const fuzz::Target& t = target();
    FuzzedDataProvider fdp(data, size);
    fuzz::shadow(caSysId), fuzz::zeroCaches();
    fuzz::callOne(fdp, t, "Strm_CreatStreamInfo");
    for (int calls = fdp.ConsumeIntegralInRange(1, 12); calls > 0; --calls) fuzz::callOne(fdp, t);
    return 0;
}
