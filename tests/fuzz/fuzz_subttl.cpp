// The subtitle display set as the subtitle module writes it: GetData patches the exported
// buffer Data from the input (counts, page, region headers and sizes, pixels, objects, CLUTs,
// display), then every native that register_android_dvb_Subttl registers runs, the readers
// with indexes at any value.
#include "Harness.h"
#include "Registration.h"

// The display-set buffer, exported by name.
extern SUBTTL_Data Data;

namespace {

class FuzzSubttl : public android::Subttl {
public:
    int32_t Init() override { return fuzz::op(); }
    int32_t Start(const SUBTTL_Settings*) override { return fuzz::op(); }
    int32_t Stop(int32_t) override { return fuzz::op(); }
    // Up to 12 patches, anywhere or where the readers look: the counts and the page, a region's
    // nine ints (its size among them) or what follows its pixels, everything after the regions.
    int32_t GetData(int32_t, void* data) override {
        FUZZ_CHECK(data == &Data);
        FuzzedDataProvider& in = *fuzz::now.input;
        for (int n = in.ConsumeIntegralInRange(0, 12); n > 0; --n) {
            using R = SUBTTL_Region_t;
            const size_t regions = offsetof(SUBTTL_Data, regions),
                         tail = offsetof(R, i_object_defs);
            const size_t r = regions + in.ConsumeIntegralInRange(0, 4) * sizeof(R);
            const size_t cluts = offsetof(SUBTTL_Data, numCluts);
            const std::pair<size_t, size_t> areas[] = {{0, sizeof Data},
                                                       {0, regions},
                                                       {r, offsetof(R, p_pixbuf)},
                                                       {r + tail, sizeof(R) - tail},
                                                       {cluts, sizeof Data - cluts}};
            const auto [start, size] = areas[in.ConsumeIntegralInRange(0, 4)];
            const size_t at = start + in.ConsumeIntegral<uint32_t>() % size;
            auto bytes = in.ConsumeBytes<char>(in.ConsumeIntegralInRange<size_t>(1, 64));
            bytes.resize(std::min(bytes.size(), sizeof Data - at));
            std::copy(bytes.begin(), bytes.end(), reinterpret_cast<char*>(&Data) + at);
        }
        fuzz::now.written.push_back({"SUBTTL_Data", &Data, {&Data, [](const void*) {}}});
        return fuzz::op();
    }
};

fuzz::Mapping mapping() {
    fuzz::Mapping m;
    m.counts = {{"SUBTTL_Data_t", 4},    {"SUBTTL_Page_t", 5},  {"SUBTTL_RegionDef", 3},
                {"SUBTTL_ObjectDef", 8}, {"SUBTTL_Display", 9}, {"SUBTTL_Clut", 5}};
    m.records["SUBTTL_Data_t"] = "SUBTTL_Data";
    m.whole = {"SUBTTL_ObjectDef.psz_text"};
    return m;
}
const fuzz::Mapping kMapping = mapping();

// The size rule: n = width x height as a 32-bit product. A negative n zeroes the size Java sees
// and delivers nothing more. Otherwise Java gets n pixels, but never more than the buffer
// holds: a size above it (as n or as the real product) delivers the rows that fit, none for a
// width of 0 or less, and Java is told that height.
void expectRegion(jobject out, const void* entry) {
    constexpr int32_t kRoom = kSubttlRegionPixels;
    const SUBTTL_Region_t& r = *static_cast<const SUBTTL_Region_t*>(entry);
    const int32_t w = r.i_width, h = r.i_height;
    const auto n = static_cast<int32_t>(static_cast<uint32_t>(w) * static_cast<uint32_t>(h));
    const bool cut = n > kRoom || int64_t{w} * h > kRoom;
    const int32_t told = n < 0 ? 0 : !cut ? h : w > 0 ? kRoom / w : 0;
    const size_t pixels = n < 0 ? 0 : !cut ? n : w > 0 ? size_t(w) * told : 0;
    auto& set = fuzz::live(out)->set;
    fuzz::expectFields(out, "SUBTTL_Region_t", &r, &r, kMapping,
                       {"i_width", "i_height", "p_pixbuf"});
    FUZZ_CHECK(set.size() == (n < 0 ? 9u : 11u) && set["i_width"].n == (n < 0 ? 0 : w) &&
               set["i_height"].n == told);
    const fuzz::Object* a = n < 0 ? nullptr : set["p_pixbuf"].ref;
    FUZZ_CHECK(n < 0 ||
               (a != nullptr && a->kind == fuzz::Kind::ByteArray && a->data.size() == pixels));
    FUZZ_CHECK(pixels == 0 ||
               (a->from == r.p_pixbuf && memcmp(a->data.data(), r.p_pixbuf, pixels) == 0));
}

const fuzz::Target& target() {
    static const fuzz::Target t(
            register_android_dvb_Subttl, [](android::DVB& dvb) { dvb.mSubttl = new FuzzSubttl; },
            kMapping,
            {fuzz::reader(Data, "Subttl_GetPageData", {kSubttlPages},
                          [](const jint* i) { return &Data.page[i[0]]; }),
             fuzz::reader(Data, "Subttl_GetRegionDefData", {kSubttlPages, kSubttlRegionDefs},
                          [](const jint* i) { return &Data.page[i[0]].region_defs[i[1]]; }),
             fuzz::reader(
                     Data, "Subttl_GetRegionData", {kSubttlRegions},
                     [](const jint* i) { return &Data.regions[i[0]]; }, expectRegion),
             fuzz::reader(Data, "Subttl_GetRegionObjectDefData",
                          {kSubttlRegions, kSubttlObjectDefs},
                          [](const jint* i) { return &Data.regions[i[0]].object_defs[i[1]]; }),
             fuzz::reader(Data, "Subttl_GetClutData", {kSubttlCluts},
                          [](const jint* i) { return &Data.cluts[i[0]]; }),
             fuzz::reader(Data, "Subttl_GetDisplayData", {},
                          [](const jint*) { return &Data.display; }),
             fuzz::reader(Data, "Subttl_GetDefaultClutData", {},
                          [](const jint*) { return &Data.defaultClut; })},
            false);
    return t;
}

}  // namespace

// Each input starts from a cleared buffer with the module's display set, then any calls.
extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const fuzz::Target& t = target();
    FuzzedDataProvider fdp(data, size);
    memset(&Data, 0, sizeof Data);
    fuzz::callOne(fdp, t, "Subttl_GetData");
    for (int calls = fdp.ConsumeIntegralInRange(1, 8); calls > 0; --calls) fuzz::callOne(fdp, t);
    return 0;
}
