#include <gtest/gtest.h>
#include <png.h>

#include <cstdlib>
#include <string>
#include <vector>

#include "Captures.h"
#include "Ycc.h"
#include "broadcast/DvbSubtitle.h"
#include "broadcast/Ts.h"

using namespace dvbmodel;
using namespace testdata;

namespace {

std::vector<DisplaySet> decode(DvbSubtitleDecoder& d, const Packets& pes) {
    std::vector<DisplaySet> out;
    for (const auto& p : pes) d.feed(p.data(), p.size(), out);
    return out;
}

// The display set on its display: each placed region's pixels as the colours of its CLUT
// (the default CLUT where the epoch defined none), by the library's BT.601 conversion. With a
// display window, the page sits at the window's top left corner.
std::vector<uint32_t> compose(const DisplaySet& s) {
    std::vector<uint32_t> canvas(size_t{s.displayWidth} * s.displayHeight, 0);
    for (RegionRef at : s.placements) {
        at.x += s.windowed ? s.windowX : 0, at.y += s.windowed ? s.windowY : 0;
        for (const Region& r : s.regions) {
            if (r.id != at.id) continue;
            const Clut* clut = &defaultClut();
            for (const Clut& c : s.cluts) clut = c.id == r.clutId ? &c : clut;
            const ClutEntry* table = r.depth == 1   ? clut->c2.data()
                                     : r.depth == 2 ? clut->c4.data()
                                                    : clut->c8.data();
            for (int y = 0; y < r.height && at.y + y < s.displayHeight; ++y)
                for (int x = 0; x < r.width && at.x + x < s.displayWidth; ++x) {
                    const ClutEntry& e = table[r.pixels[size_t(y) * r.width + x]];
                    canvas[size_t(at.y + y) * s.displayWidth + at.x + x] =
                            static_cast<uint32_t>(dvbjni::yccToArgb(e.y, e.cr, e.cb, e.t));
                }
        }
    }
    return canvas;
}

// A PNG's pixels as ARGB, row by row; none when it cannot be read.
std::vector<uint32_t> readPng(const std::string& path) {
    png_image image{};
    image.version = PNG_IMAGE_VERSION;
    if (!png_image_begin_read_from_file(&image, path.c_str())) return {};
    // B, G, R, A in memory: a little-endian word reads as ARGB.
    image.format = PNG_FORMAT_BGRA;
    std::vector<uint32_t> argb(PNG_IMAGE_SIZE(image) / 4);
    bool read = png_image_finish_read(&image, nullptr, argb.data(), 0, nullptr);
    return read ? argb : std::vector<uint32_t>();
}

// Pixels where the two renderings differ: fully transparent counts as equal whatever its
// colour; otherwise no channel may differ by more than `tolerance`.
size_t differences(const std::vector<uint32_t>& a, const std::vector<uint32_t>& b, int tolerance) {
    if (a.size() != b.size()) return a.size() + b.size();
    size_t count = 0;
    for (size_t i = 0; i < a.size(); ++i) {
        bool differs = false;
        for (int shift = 0; shift < 32; shift += 8)
            differs |= std::abs(int(a[i] >> shift & 255) - int(b[i] >> shift & 255)) > tolerance;
        count += differs && (a[i] >> 24 || b[i] >> 24);
    }
    return count;
}

static_assert(sizeof(Clut) == 2 + (4 + 16 + 256) * 4, "CLUT tables back to back");

// Every field of a display set that travels in segments, in one row of numbers.
std::vector<int> flat(const DisplaySet& s) {
    std::vector<int> v = {s.pageId,     s.timeout,        s.version,      s.state,
                          s.hasDisplay, s.displayVersion, s.displayWidth, s.displayHeight,
                          s.windowed,   s.windowX,        s.windowY,      s.windowMaxX,
                          s.windowMaxY};
    for (const RegionRef& p : s.placements) v.insert(v.end(), {-1, p.id, p.x, p.y});
    for (const Region& r : s.regions) {
        v.insert(v.end(), {-2, r.id, r.version, r.width, r.height, r.depth, r.clutId, r.fill,
                           r.background8, r.background4, r.background2});
        v.insert(v.end(), r.pixels.begin(), r.pixels.end());
        for (const ObjectRef& o : r.objects) v.insert(v.end(), {-3, o.id, o.type, o.x, o.y});
    }
    for (const Clut& c : s.cluts) {
        v.insert(v.end(), {-4, c.id, c.version});
        const auto* bytes = &c.c2[0].y;  // the tables, entries of four bytes, back to back
        v.insert(v.end(), bytes, bytes + (4 + 16 + 256) * 4);
    }
    return v;
}

// Display sets that exercise every code of every depth: runs of every length from 1 to past
// the longest code, over every CLUT index, in 2-, 4- and 8-bit regions; CLUTs with
// reduced-range and full-range entries.
DisplaySet sample() {
    DisplaySet s;
    s.pageId = 3, s.timeout = 7, s.version = 5, s.state = 2;
    s.hasDisplay = true, s.displayVersion = 1, s.windowed = true;
    s.windowX = 8, s.windowY = 16, s.windowMaxX = 711, s.windowMaxY = 559;
    uint32_t seed = 12345;
    auto next = [&seed](uint32_t n) { return ((seed = seed * 1103515245u + 12345u) >> 16) % n; };
    const uint16_t sizes[3][2] = {{97, 5}, {640, 7}, {400, 4}};
    for (uint8_t d = 1; d <= 3; ++d) {
        Region r;
        r.id = r.levelOfCompatibility = r.depth = d, r.version = uint8_t(d + 2);
        r.width = sizes[d - 1][0], r.height = sizes[d - 1][1], r.clutId = d % 2, r.fill = true;
        r.background8 = 200, r.background4 = 9, r.background2 = 2;
        r.objects = {ObjectRef{uint16_t(40 + d), 0, 0, 0, 0, 0, {}}};
        uint32_t codes = 1u << (2 << (d - 1));
        while (r.pixels.size() < size_t{r.width} * r.height) {
            uint32_t length = 1 + next(next(4) == 0 ? 300 : 12);
            r.pixels.insert(r.pixels.end(), length, static_cast<uint8_t>(next(codes)));
        }
        r.pixels.resize(size_t{r.width} * r.height);
        s.regions.push_back(r);
        s.placements.push_back(RegionRef{d, uint16_t(10 * d), uint16_t(100 * d)});
    }
    for (uint8_t id = 0; id < 2; ++id) {
        Clut c = defaultClut();
        c.id = id, c.version = 9 + id;
        for (ClutEntry* e : {&c.c2[1], &c.c4[5], &c.c8[7], &c.c8[255]}) {
            // Reduced range keeps the top 6, 4, 4 and 2 bits; full range any value.
            *e = id == 0 ? ClutEntry{uint8_t(next(64) << 2 | 4), uint8_t(next(16) << 4),
                                     uint8_t(next(16) << 4), uint8_t(next(4) << 6)}
                         : ClutEntry{uint8_t(16 + next(220)), uint8_t(next(256)),
                                     uint8_t(next(256)), uint8_t(next(256))};
        }
        s.cluts.push_back(c);
    }
    return s;
}

TEST(DvbSubtitle, CanalPlusCaptureMatchesItsTruthAndFfmpegRendering) {
    NEED_CAPTURE("dvbsub-canalplus-cinema.ts");
    DvbSubtitleDecoder decoder(3, 4);
    std::vector<DisplaySet> sets = decode(decoder, pes("dvbsub-canalplus-cinema.ts", 0x0157));
    ASSERT_EQ(sets.size(), 1u);
    const DisplaySet& s = sets[0];
    EXPECT_EQ(s.pts, 5826066156u);
    ASSERT_EQ(s.placements.size() * 10 + s.regions.size() * 100 + s.cluts.size(), 422u);
    // What ffmpeg's rendering below does not show: page, state, versions, timeout, object ids.
    std::vector<int> hidden = {s.pageId, s.state, s.version, s.timeout};
    for (const Region& r : s.regions) {
        hidden.insert(hidden.end(), {r.id, r.version});
        for (const ObjectRef& o : r.objects) hidden.push_back(o.id);
    }
    for (const Clut& c : s.cluts) hidden.insert(hidden.end(), {c.id, c.version});
    EXPECT_EQ(hidden, std::vector<int>({3, 2, 2, 10, 0, 14, 35439, 1, 14, 35440, 2, 14, 3, 14, 1,
                                        14, 2, 3}));
    const DvbSubtitleStats& stats = decoder.stats();
    EXPECT_EQ(stats.segments, 11u);
    EXPECT_EQ(stats.segmentsDropped + stats.objectsDropped + stats.runsClipped + stats.missingCluts,
              0u);

    std::vector<uint32_t> ffmpeg =
            readPng(DVB_TESTDATA_DIR "/truth/dvbsub-canalplus-cinema.pid0157.set1.ffmpeg.png");
    ASSERT_EQ(ffmpeg.size(), 720u * 576u);
    // ffmpeg converts Y, Cr, Cb by its own rounded fixed-point BT.601, not by the truncated
    // one of the CLUT readers: 2538 pixels of this set differ by 1 in a channel, none by more.
    // A misplaced pixel or a wrong CLUT index differs by far more.
    EXPECT_EQ(differences(compose(s), ffmpeg, 1), 0u);
}

TEST(DvbSubtitle, DamagedCaptureKeepsItsSoundParts) {
    NEED_CAPTURE("damaged-subtitles-teletext.ts");
    DvbSubtitleDecoder decoder(2, 2);
    std::vector<DisplaySet> sets = decode(decoder, pes("damaged-subtitles-teletext.ts", 0x4B));
    ASSERT_EQ(sets.size(), 2u);
    const DisplaySet& s = sets[1];
    ASSERT_EQ(s.placements.size() * 10 + s.regions.size(), 11u);
    const Region& r = s.regions[0];
    EXPECT_EQ(std::vector<int64_t>({int64_t(sets[0].pts), sets[0].state, sets[0].timeout,
                                    sets[0].version, int64_t(sets[0].placements.size()),
                                    int64_t(s.pts), s.placements[0].y, r.width, r.height, r.depth,
                                    r.clutId, r.objects.at(0).x}),
              std::vector<int64_t>({5115973396, 0, 30, 3, 0, 8337209663, 510, 720, 42, 2, 0, 190}));
    // The CLUT that reads as object data 32 is dropped, so CLUT 0 is missing: the region is
    // shown with the default CLUT; its object (0) is drawn right of x 190.
    EXPECT_TRUE(s.cluts.empty());
    EXPECT_EQ(decoder.stats().objectsDropped * 10 + decoder.stats().missingCluts, 11u);
    size_t drawn = 0, misplaced = 0;
    for (size_t i = 0; i < r.pixels.size(); ++i)
        (i % r.width < 190 ? misplaced : drawn) += r.pixels[i] != 0;
    EXPECT_TRUE(drawn > 1000 && misplaced == 0) << drawn << " drawn, " << misplaced << " misplaced";
}

TEST(DvbSubtitle, RoundTripThroughTheEncoder) {
    const DisplaySet s = sample();
    DvbSubtitleDecoder decoder(3, 4);
    std::vector<DisplaySet> out = decode(decoder, {encodeDisplaySet(s, 3, 0x1ABCDEF01ull)});
    ASSERT_EQ(out.size(), 1u);
    EXPECT_EQ(out[0].pts, 0x1ABCDEF01ull);
    EXPECT_TRUE(flat(out[0]) == flat(s));
    EXPECT_EQ(decoder.stats().segments, 2u + 3 + 2 + 3 + 1);

    // A normal case with unchanged versions is not applied again; new versions are.
    DisplaySet update = s;
    update.state = 0, update.cluts[1].c4[5] = ClutEntry{80, 90, 100, 0};
    update.placements.pop_back();
    for (uint8_t& p : update.regions[0].pixels) p = 3;
    out = decode(decoder, {encodeDisplaySet(update, 3, 1)});
    EXPECT_TRUE(out.size() == 1 && flat(out[0]) == flat(s)) << out.size();
    update.version = 6, update.regions[0].version = 1, update.cluts[1].version = 0;
    out = decode(decoder, {encodeDisplaySet(update, 3, 2)});
    EXPECT_TRUE(out.size() == 1 && flat(out[0]) == flat(update)) << out.size();
    DisplaySet thin = s;  // an 8-bit region of no width, as damage makes: no pixel read or sent
    thin.regions[2].width = 0, thin.regions[2].pixels.clear();
    EXPECT_TRUE(flat(decode(decoder, {encodeDisplaySet(thin, 3, 3)}).at(0)) == flat(thin));
    EXPECT_EQ(decoder.stats().runsClipped, 0u);
}

// Damage made on purpose, each from an encoded display set: what is sound stays.
TEST(DvbSubtitle, DamagedSegmentsAreDroppedAndCounted) {
    const DisplaySet s = sample();
    const std::vector<uint8_t> good = encodeDisplaySet(s, 3, 0);
    auto bodyOf = [&good](uint8_t type, int nth) {
        for (size_t i = 16; i + 6 <= good.size(); i += 6 + (good[i + 4] << 8 | good[i + 5]))
            if (good[i + 1] == type && nth-- == 0) return i + 6;
        return size_t{0};
    };
    // The flags of the CLUT segment's last entry: its range bit flipped, the entry runs past
    // the segment's end (a full-range entry takes 6 bytes, a reduced one 4).
    const size_t clut = bodyOf(0x12, 0), clutEnd = clut + (good[clut - 2] << 8 | good[clut - 1]);
    size_t lastFlags = clut + 3;
    for (size_t i = clut + 2; i + 1 < clutEnd; i += (good[i + 1] & 1) ? 6 : 4) lastFlags = i + 1;
    // What: the byte at `at` set to `value`; the count that tells; whether the 4-bit region's
    // pixels survive; the bytes kept.
    using St = DvbSubtitleStats;
    const struct {
        const char* what;
        size_t at, value;
        uint32_t St::*counter;
        bool regionTwoDrawn;
        size_t keep = SIZE_MAX;
    } cases[] = {
            {"CLUT typed as object data", bodyOf(0x12, 0) - 5, 0x13, &St::missingCluts, true},
            {"object field past its end", bodyOf(0x13, 1) + 3, 0xFF, &St::objectsDropped, false},
            {"object of a reserved coding", bodyOf(0x13, 1) + 2, 0x0C, &St::objectsDropped, false},
            {"CLUT entry overruns", lastFlags, good[lastFlags] ^ 1u, &St::segmentsDropped, true},
            {"object past the region's edge", bodyOf(0x11, 1) + 12, 0x02, &St::runsClipped, false},
            {"last object without sync, cut short", bodyOf(0x13, 2) - 6, 0x0E, &St::segmentsDropped,
             true, bodyOf(0x13, 2) + 40},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.what);
        std::vector<uint8_t> pes = good;
        pes[c.at] = static_cast<uint8_t>(c.value);
        pes.resize(std::min(c.keep, pes.size()));
        DvbSubtitleDecoder decoder(3, 4);
        std::vector<DisplaySet> out = decode(decoder, {pes});
        // A display set that lost its end comes out when the next page composition arrives.
        decoder.feed(nullptr, 0, out);
        if (out.empty()) out = decode(decoder, {encodeDisplaySet(DisplaySet(), 3, 0)});
        ASSERT_FALSE(out.empty());
        EXPECT_GT(decoder.stats().*c.counter, 0u);
        EXPECT_EQ(decoder.stats().pesDropped, 1u);  // the null packet
        ASSERT_EQ(out[0].regions.size(), 3u);
        EXPECT_EQ(out[0].regions[1].pixels == s.regions[1].pixels, c.regionTwoDrawn);
        EXPECT_EQ(out[0].regions[0].pixels, s.regions[0].pixels);
    }
    // A PES that lost its last packet is dropped, not handed on when the next PES starts.
    std::vector<uint8_t> ts;
    uint8_t cc = 0;
    packetizePes(0x20, good, cc, ts), ts.resize(ts.size() - 188), packetizePes(0x20, good, cc, ts);
    Packets got;
    PesAssembler(0x20).feed(ts.data(), ts.size(), got);
    EXPECT_TRUE(got == Packets{good}) << got.size() << " PES";
}

// One PSI section, CRC included, in one transport packet.
void section(std::vector<uint8_t>& ts, uint16_t pid, std::vector<uint8_t> s) {
    s.insert(s.begin(), {0x47, uint8_t(0x40 | pid >> 8), uint8_t(pid), 0x10, 0});
    s.resize(188, 0xFF);
    ts.insert(ts.end(), s.begin(), s.end());
}

TEST(DvbSubtitle, FfmpegRendersTheEncodedDisplaySet) {
    if (std::system("ffmpeg -version >/dev/null 2>&1") != 0)
        GTEST_SKIP() << "ffmpeg is not on PATH (Debian package ffmpeg): no independent decoder";
    TempDir dir;
    std::vector<uint8_t> ts;
    section(ts, 0, {0x00, 0xB0, 0x0D, 0, 1, 0xC1, 0, 0, 0, 1, 0xE1, 0x00, 0xE8, 0xF9, 0x5E, 0x7D});
    // PMT: PCR and subtitles on PID 0x101, subtitling descriptor "fra", pages 3 and 4.
    section(ts, 0x100,
            {0x02, 0xB0, 0x1C, 0,   1,   0xC1, 0,    0, 0xE1, 1, 0xF0, 0,    6,    0xE1, 1,   0xF0,
             10,   0x59, 8,    'f', 'r', 'a',  0x10, 0, 3,    0, 4,    0xF2, 0x94, 0x48, 0x5F});
    const DisplaySet s = sample();
    DisplaySet clear;
    clear.state = 0, clear.version = 6;
    uint8_t cc = 0;
    packetizePes(0x101, encodeDisplaySet(s, 3, 90000), cc, ts);
    packetizePes(0x101, encodeDisplaySet(clear, 3, 180000), cc, ts);
    dir.write("sub.ts", ts);
    std::string command = "cd " + dir.path.string() +
                          " && ffmpeg -nostdin -loglevel error -y -i sub.ts -filter_complex "
                          "'[0:0]showinfo[s]' -map '[s]' -fps_mode passthrough f%03d.png";
    ASSERT_EQ(std::system(command.c_str()), 0) << command;
    std::vector<uint32_t> ours = compose(s);
    size_t frames = 0, matched = 0;
    for (const auto& f : fs::directory_iterator(dir.path)) {
        if (f.path().extension() != ".png") continue;
        ++frames;
        // Same rule as for the capture: ffmpeg's own rounding, at most 1 per channel.
        matched += differences(ours, readPng(f.path().string()), 1) == 0;
    }
    // The display set, repeated by the frame-rate conversion, between empty frames.
    EXPECT_GT(frames, matched);
    EXPECT_GE(matched, 1u);
}

}  // namespace
