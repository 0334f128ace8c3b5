// The subtitle display set as the subtitle module writes it: the module's Subttl_GetData
// scatters input bytes over the exported buffer Data (page, region headers and sizes, pixels,
// objects, CLUTs, display), then the library's readers run with any indexes, through the
// natives that register_android_dvb_Subttl registers. While a reader runs, every byte of Data
// outside the one record it may read is poisoned for AddressSanitizer, and each byte-array copy
// must come from inside that record's own field.
#include <DVB.h>
#include <fuzzer/FuzzedDataProvider.h>
#include <sanitizer/asan_interface.h>

#include <cstring>
#include <initializer_list>
#include <string>
#include <vector>

#include "FakeJni.h"
#include "Registration.h"
#include "Ycc.h"

// The display-set buffer, exported by name.
extern SUBTTL_Data Data;

namespace {

struct Patch {
    size_t at;
    std::vector<uint8_t> bytes;
};

// A subtitle module that writes the fuzzer's patches over the cleared buffer.
class FuzzSubttl : public android::Subttl {
public:
    int32_t Init() override { return 0; }
    int32_t Start(const SUBTTL_Settings*) override { return 0; }
    int32_t Stop(int32_t) override { return 0; }
    int32_t GetData(int32_t, void* data) override {
        FUZZ_CHECK(data == &Data);
        for (const Patch& p : patches) {
            memcpy(static_cast<uint8_t*>(data) + p.at, p.bytes.data(), p.bytes.size());
        }
        return 0;
    }

    std::vector<Patch> patches;
};

using GetData = jint (*)(JNIEnv*, jobject, jlong, jobject);
using ReadOne = jint (*)(JNIEnv*, jobject, jobject);
using ReadAt = jint (*)(JNIEnv*, jobject, jint, jobject);
using ReadAtAt = jint (*)(JNIEnv*, jobject, jint, jint, jobject);

constexpr const char* kSubttl = "android/DVB/Subttl";
constexpr const char* kDataClass = "android/DVB/Subttl$SUBTTL_Data_t";
constexpr const char* kPageClass = "android/DVB/Subttl$SUBTTL_Page_t";
constexpr const char* kRegionDefClass = "android/DVB/Subttl$SUBTTL_RegionDef";
constexpr const char* kRegionClass = "android/DVB/Subttl$SUBTTL_Region_t";
constexpr const char* kObjectDefClass = "android/DVB/Subttl$SUBTTL_ObjectDef";
constexpr const char* kDisplayClass = "android/DVB/Subttl$SUBTTL_Display";
constexpr const char* kClutClass = "android/DVB/Subttl$SUBTTL_Clut";

struct Harness {
    FuzzSubttl* subttl;
    jint context;
    GetData getData;
    ReadAt page, region, clut;
    ReadAtAt regionDef, objectDef;
    ReadOne display, defaultClut;
};

FuzzSubttl* gInstalled;

Harness& harness() {
    static Harness h = [] {
        fakejni::Env& env = fakejni::env();
        FUZZ_CHECK(register_android_dvb_Subttl(env.get()) == 0 && !env.pending());
        Harness s;
        s.context = fakejni::bindDvb([](android::DVB& dvb) {
            gInstalled = new FuzzSubttl;
            dvb.mSubttl = gInstalled;
        });
        s.subttl = gInstalled;
        // Every reader returns an int.
        auto native = [&](const char* name, const std::string& args) {
            return env.native(kSubttl, name, ("(" + args + ")I").c_str());
        };
        s.getData = reinterpret_cast<GetData>(
                native("Subttl_GetData", "JLandroid/DVB/Subttl$SUBTTL_Data_t;"));
        s.page = reinterpret_cast<ReadAt>(
                native("Subttl_GetPageData", "ILandroid/DVB/Subttl$SUBTTL_Page_t;"));
        s.regionDef = reinterpret_cast<ReadAtAt>(
                native("Subttl_GetRegionDefData", "IILandroid/DVB/Subttl$SUBTTL_RegionDef;"));
        s.region = reinterpret_cast<ReadAt>(
                native("Subttl_GetRegionData", "ILandroid/DVB/Subttl$SUBTTL_Region_t;"));
        s.objectDef = reinterpret_cast<ReadAtAt>(
                native("Subttl_GetRegionObjectDefData", "IILandroid/DVB/Subttl$SUBTTL_ObjectDef;"));
        s.clut = reinterpret_cast<ReadAt>(
                native("Subttl_GetClutData", "ILandroid/DVB/Subttl$SUBTTL_Clut;"));
        s.display = reinterpret_cast<ReadOne>(
                native("Subttl_GetDisplayData", "Landroid/DVB/Subttl$SUBTTL_Display;"));
        s.defaultClut = reinterpret_cast<ReadOne>(
                native("Subttl_GetDefaultClutData", "Landroid/DVB/Subttl$SUBTTL_Clut;"));
        return s;
    }();
    return h;
}

fakejni::Env& env() {
    return fakejni::env();
}

// ---- the module's output -----------------------------------------------------------------

size_t regionAt(size_t r) {
    return offsetof(SUBTTL_Data, regions) + r * sizeof(SUBTTL_Region_t);
}

// Where patches land: the places the readers look at, and anywhere at all.
struct Area {
    size_t at;
    size_t size;
};

std::vector<Area> areas() {
    std::vector<Area> a = {
            {0, sizeof(SUBTTL_Data)},
            {0, offsetof(SUBTTL_Data, page)},
            {offsetof(SUBTTL_Data, page), sizeof(SUBTTL_Page_t)},
            {offsetof(SUBTTL_Data, numCluts),
             sizeof(SUBTTL_Data) - offsetof(SUBTTL_Data, numCluts)},
    };
    for (size_t r = 0; r < kSubttlRegions; ++r) {
        a.push_back({regionAt(r), offsetof(SUBTTL_Region_t, p_pixbuf)});     // the nine ints
        a.push_back({regionAt(r) + offsetof(SUBTTL_Region_t, i_width), 8});  // the size
        a.push_back({regionAt(r) + offsetof(SUBTTL_Region_t, i_object_defs),
                     sizeof(SUBTTL_Region_t) - offsetof(SUBTTL_Region_t, i_object_defs)});
        a.push_back({regionAt(r), sizeof(SUBTTL_Region_t)});
    }
    return a;
}

void makePatches(FuzzedDataProvider& fdp, std::vector<Patch>* patches) {
    static const std::vector<Area> kAreas = areas();
    patches->clear();
    const int n = fdp.ConsumeIntegralInRange(0, 12);
    for (int i = 0; i < n; ++i) {
        const Area& area = kAreas[fdp.ConsumeIntegralInRange<size_t>(0, kAreas.size() - 1)];
        size_t at = area.at + fdp.ConsumeIntegral<uint32_t>() % area.size;
        std::vector<uint8_t> bytes = fdp.ConsumeBytes<uint8_t>(fdp.ConsumeIntegralInRange(1, 64));
        if (bytes.size() > sizeof(SUBTTL_Data) - at) bytes.resize(sizeof(SUBTTL_Data) - at);
        if (!bytes.empty()) patches->push_back({at, std::move(bytes)});
    }
}

// ---- poisoning ---------------------------------------------------------------------------

// Leaves only [record, record + size) of Data readable (null: none of it). The poisoning is
// exact after the record and may leave up to 7 bytes before it readable.
void fence(const void* record, size_t size) {
    auto* base = reinterpret_cast<char*>(&Data);
    if (record == nullptr) {
        ASAN_POISON_MEMORY_REGION(base, sizeof(SUBTTL_Data));
        return;
    }
    const char* begin = static_cast<const char*>(record);
    const char* end = begin + size;
    ASAN_POISON_MEMORY_REGION(base, static_cast<size_t>(begin - base));
    ASAN_POISON_MEMORY_REGION(end, sizeof(SUBTTL_Data) - static_cast<size_t>(end - base));
}

void unfence() {
    ASAN_UNPOISON_MEMORY_REGION(&Data, sizeof(SUBTTL_Data));
}

// ---- the oracle --------------------------------------------------------------------------

void expectInt(jobject out, const char* name, jint want) {
    const fakejni::Value* v = env().value(out, name);
    FUZZ_CHECK(v != nullptr && v->type == 'I' && v->i == want);
}

void expectUnset(jobject out, const char* name) {
    FUZZ_CHECK(env().value(out, name) == nullptr);
}

void expectCopiesWithin(const void* field, size_t size) {
    for (const fakejni::Copy& c : env().copies()) {
        const char* from = static_cast<const char*>(c.source);
        const char* begin = static_cast<const char*>(field);
        FUZZ_CHECK(from >= begin && from + c.bytes <= begin + size);
    }
}

const fakejni::Object* arrayIn(jobject out, const char* name, fakejni::Kind kind) {
    const fakejni::Value* v = env().value(out, name);
    FUZZ_CHECK(v != nullptr && v->type == 'L' && v->object != nullptr);
    FUZZ_CHECK(v->object->kind == kind);
    return v->object;
}

template <size_t N>
void expectColours(jobject out, const char* name, const SUBTTL_ClutEntry (&entries)[N]) {
    const fakejni::Object* a = arrayIn(out, name, fakejni::Kind::IntArray);
    FUZZ_CHECK(a->ints.size() == N);
    for (size_t i = 0; i < N; ++i) {
        const SUBTTL_ClutEntry& e = entries[i];
        FUZZ_CHECK(a->ints[i] == dvbjni::yccToArgb(e.y, e.cr, e.cb, e.t));
    }
}

void expectClut(jobject out, const SUBTTL_Clut& c) {
    expectInt(out, "i_id", c.i_id);
    expectInt(out, "i_version", c.i_version);
    expectColours(out, "c_2b", c.c_2b);
    expectColours(out, "c_4b", c.c_4b);
    expectColours(out, "c_8b", c.c_8b);
    FUZZ_CHECK(env().setCount(out) == 5);
}

void expectPage(jobject out, const SUBTTL_Page_t& p) {
    expectInt(out, "i_id", p.i_id);
    expectInt(out, "i_timeout", p.i_timeout);
    expectInt(out, "i_state", p.i_state);
    expectInt(out, "i_version", p.i_version);
    expectInt(out, "i_region_defs", p.i_region_defs);
    FUZZ_CHECK(env().setCount(out) == 5);
}

void expectRegionDef(jobject out, const SUBTTL_RegionDef& d) {
    expectInt(out, "i_id", d.i_id);
    expectInt(out, "i_x", d.i_x);
    expectInt(out, "i_y", d.i_y);
    FUZZ_CHECK(env().setCount(out) == 3);
}

void expectObjectDef(jobject out, const SUBTTL_ObjectDef& o) {
    expectInt(out, "i_id", o.i_id);
    expectInt(out, "i_type", o.i_type);
    expectInt(out, "i_x", o.i_x);
    expectInt(out, "i_y", o.i_y);
    expectInt(out, "i_fg_pc", o.i_fg_pc);
    expectInt(out, "i_bg_pc", o.i_bg_pc);
    expectInt(out, "i_text_length", o.i_text_length);
    expectCopiesWithin(o.psz_text, sizeof o.psz_text);
    const fakejni::Object* text = arrayIn(out, "psz_text", fakejni::Kind::ByteArray);
    FUZZ_CHECK(text->bytes.size() == sizeof o.psz_text);
    FUZZ_CHECK(memcmp(text->bytes.data(), o.psz_text, sizeof o.psz_text) == 0);
    FUZZ_CHECK(env().setCount(out) == 8);
}

void expectDisplay(jobject out, const SUBTTL_Display& d) {
    expectInt(out, "i_id", d.i_id);
    expectInt(out, "i_version", d.i_version);
    expectInt(out, "i_width", d.i_width);
    expectInt(out, "i_height", d.i_height);
    expectInt(out, "b_windowed", d.b_windowed);
    expectInt(out, "i_x", d.i_x);
    expectInt(out, "i_y", d.i_y);
    expectInt(out, "i_max_x", d.i_max_x);
    expectInt(out, "i_max_y", d.i_max_y);
    FUZZ_CHECK(env().setCount(out) == 9);
}

// The size rule: n = width x height as a 32-bit product. A negative n zeroes the size Java
// sees and delivers nothing more. Otherwise Java gets n pixels, but never more than the pixel
// buffer holds: a size above it (as n or as the real product) delivers the rows that fit,
// none for a width of 0 or less, and Java is told that height.
void expectRegion(jobject out, const SUBTTL_Region_t& r) {
    constexpr int32_t kRoom = kSubttlRegionPixels;
    // Safety first: any byte-array copy stays inside this region's pixels.
    expectCopiesWithin(r.p_pixbuf, sizeof r.p_pixbuf);
    expectInt(out, "i_id", r.i_id);
    expectInt(out, "i_version", r.i_version);
    expectInt(out, "i_x", r.i_x);
    expectInt(out, "i_y", r.i_y);
    expectInt(out, "i_level_comp", r.i_level_comp);
    expectInt(out, "i_depth", r.i_depth);
    expectInt(out, "i_clut", r.i_clut);
    const int32_t w = r.i_width;
    const int32_t h = r.i_height;
    const auto n = static_cast<int32_t>(static_cast<uint32_t>(w) * static_cast<uint32_t>(h));
    if (n < 0) {
        expectInt(out, "i_width", 0);
        expectInt(out, "i_height", 0);
        expectUnset(out, "p_pixbuf");
        expectUnset(out, "i_object_defs");
        return;
    }
    int32_t told = h;
    int64_t pixels = n;
    if (n > kRoom || int64_t{w} * h > kRoom) {
        told = w > 0 ? kRoom / w : 0;
        pixels = int64_t{w > 0 ? w : 0} * told;
    }
    expectInt(out, "i_width", w);
    expectInt(out, "i_height", told);
    const fakejni::Object* pixbuf = arrayIn(out, "p_pixbuf", fakejni::Kind::ByteArray);
    FUZZ_CHECK(pixbuf->bytes.size() <= sizeof r.p_pixbuf);
    FUZZ_CHECK(pixbuf->bytes.size() == static_cast<size_t>(pixels));
    FUZZ_CHECK(pixels == 0 || memcmp(pixbuf->bytes.data(), r.p_pixbuf, pixbuf->bytes.size()) == 0);
    expectInt(out, "i_object_defs", r.i_object_defs);
}

void expectThrown(jint result, const char* className, const std::string& message) {
    FUZZ_CHECK(result == -1 && env().pending());
    FUZZ_CHECK(env().exceptionClass() == className);
    FUZZ_CHECK(env().exceptionMessage() == message);
}

// The reader's failure for a null object or the first index outside its room, if any.
bool expectRefused(jint result, jobject out, const char* simpleName,
                   std::initializer_list<std::pair<jint, jint>> indexes) {
    if (out == nullptr) {
        expectThrown(result, "java/lang/NullPointerException",
                     std::string(simpleName) + " is null");
        return true;
    }
    for (const auto& [index, room] : indexes) {
        if (index < 0 || index >= room) {
            expectThrown(result, "java/lang/IndexOutOfBoundsException",
                         fakejni::indexMessage(index, room));
            FUZZ_CHECK(env().setCount(out) == 0);
            return true;
        }
    }
    FUZZ_CHECK(result == 0 && !env().pending());
    return false;
}

jint pickIndex(FuzzedDataProvider& fdp, jint room) {
    if (fdp.ConsumeIntegralInRange(0, 3) == 0) return fdp.ConsumeIntegral<jint>();
    return fdp.ConsumeIntegralInRange<jint>(-1, room);
}

bool inRoom(jint index, jint room) {
    return index >= 0 && index < room;
}

// One reader call on a fresh Java object (or none), with Data fenced to what it may read.
void readOnce(FuzzedDataProvider& fdp, const Harness& h) {
    enum { kPage, kRegionDef, kRegion, kObjectDef, kClut, kDisplay, kDefaultClut, kOps };
    const int op = fdp.ConsumeIntegralInRange(0, kOps - 1);
    const bool noObject = fdp.ConsumeIntegralInRange(0, 7) == 0;
    env().reset();
    JNIEnv* e = env().get();
    jobject thiz = env().newInstance(kSubttl);
    auto object = [&](const char* className) {
        return noObject ? nullptr : env().newInstance(className);
    };
    switch (op) {
        case kPage: {
            jint p = pickIndex(fdp, kSubttlPages);
            jobject out = object(kPageClass);
            bool ok = out != nullptr && inRoom(p, kSubttlPages);
            fence(ok ? &Data.page[p] : nullptr, sizeof(SUBTTL_Page_t));
            jint result = h.page(e, thiz, p, out);
            unfence();
            if (!expectRefused(result, out, "SUBTTL_Page_t", {{p, kSubttlPages}})) {
                expectPage(out, Data.page[p]);
            }
            break;
        }
        case kRegionDef: {
            jint p = pickIndex(fdp, kSubttlPages);
            jint d = pickIndex(fdp, kSubttlRegionDefs);
            jobject out = object(kRegionDefClass);
            bool ok = out != nullptr && inRoom(p, kSubttlPages) && inRoom(d, kSubttlRegionDefs);
            fence(ok ? &Data.page[p].region_defs[d] : nullptr, sizeof(SUBTTL_RegionDef));
            jint result = h.regionDef(e, thiz, p, d, out);
            unfence();
            if (!expectRefused(result, out, "SUBTTL_RegionDef",
                               {{p, kSubttlPages}, {d, kSubttlRegionDefs}})) {
                expectRegionDef(out, Data.page[p].region_defs[d]);
            }
            break;
        }
        case kRegion: {
            jint r = pickIndex(fdp, kSubttlRegions);
            jobject out = object(kRegionClass);
            bool ok = out != nullptr && inRoom(r, kSubttlRegions);
            fence(ok ? &Data.regions[r] : nullptr, sizeof(SUBTTL_Region_t));
            jint result = h.region(e, thiz, r, out);
            unfence();
            if (!expectRefused(result, out, "SUBTTL_Region_t", {{r, kSubttlRegions}})) {
                expectRegion(out, Data.regions[r]);
            }
            break;
        }
        case kObjectDef: {
            jint r = pickIndex(fdp, kSubttlRegions);
            jint o = pickIndex(fdp, kSubttlObjectDefs);
            jobject out = object(kObjectDefClass);
            bool ok = out != nullptr && inRoom(r, kSubttlRegions) && inRoom(o, kSubttlObjectDefs);
            fence(ok ? &Data.regions[r].object_defs[o] : nullptr, sizeof(SUBTTL_ObjectDef));
            jint result = h.objectDef(e, thiz, r, o, out);
            unfence();
            if (!expectRefused(result, out, "SUBTTL_ObjectDef",
                               {{r, kSubttlRegions}, {o, kSubttlObjectDefs}})) {
                expectObjectDef(out, Data.regions[r].object_defs[o]);
            }
            break;
        }
        case kClut: {
            jint c = pickIndex(fdp, kSubttlCluts);
            jobject out = object(kClutClass);
            bool ok = out != nullptr && inRoom(c, kSubttlCluts);
            fence(ok ? &Data.cluts[c] : nullptr, sizeof(SUBTTL_Clut));
            jint result = h.clut(e, thiz, c, out);
            unfence();
            if (!expectRefused(result, out, "SUBTTL_Clut", {{c, kSubttlCluts}})) {
                expectClut(out, Data.cluts[c]);
            }
            break;
        }
        case kDisplay: {
            jobject out = object(kDisplayClass);
            fence(out != nullptr ? &Data.display : nullptr, sizeof(SUBTTL_Display));
            jint result = h.display(e, thiz, out);
            unfence();
            if (!expectRefused(result, out, "SUBTTL_Display", {})) expectDisplay(out, Data.display);
            break;
        }
        case kDefaultClut: {
            jobject out = object(kClutClass);
            fence(out != nullptr ? &Data.defaultClut : nullptr, sizeof(SUBTTL_Clut));
            jint result = h.defaultClut(e, thiz, out);
            unfence();
            if (!expectRefused(result, out, "SUBTTL_Clut", {})) expectClut(out, Data.defaultClut);
            break;
        }
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    Harness& h = harness();
    FuzzedDataProvider fdp(data, size);
    makePatches(fdp, &h.subttl->patches);

    env().reset();
    env().setContext(h.context);
    jobject thiz = env().newInstance(kSubttl);
    jobject set = env().newInstance(kDataClass);
    unfence();
    FUZZ_CHECK(h.getData(env().get(), thiz, fdp.ConsumeIntegral<jlong>(), set) == 0);
    FUZZ_CHECK(!env().pending());
    expectInt(set, "i_pts", Data.i_pts);
    expectInt(set, "numPage", Data.numPage);
    expectInt(set, "numRegions", Data.numRegions);
    expectInt(set, "numCluts", Data.numCluts);

    const int reads = fdp.ConsumeIntegralInRange(1, 8);
    for (int i = 0; i < reads; ++i) readOnce(fdp, h);
    return 0;
}
