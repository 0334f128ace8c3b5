// The built-in broadcast: deterministic, as large as a newcomer needs, internally consistent.
#if DVB_RECEIVER
#include <gtest/gtest.h>
#include <iconv.h>
#include <time.h>
#include <unistd.h>

#include <cstdio>
#include <map>
#include <set>
#include <string>

#include "Ycc.h"
#include "broadcast/Builtin.h"
#ifdef DVB_TEST_PNG_DIR
#include <png.h>
#endif

namespace {

using namespace dvbmodel;

constexpr int64_t kStart = 1736121600 + 12 * 3600 + 34 * 60 + 56;  // 2025-01-06 12:34:56 UTC
constexpr int64_t kDay = 86400;

const Broadcast& broadcast() {
    static const Broadcast b = builtinBroadcast(kStart);
    return b;
}

template <typename F>
void forEachService(const Broadcast& b, F f) {
    for (const Network& n : b.networks)
        for (const Transport& t : n.transports)
            for (const Service& s : t.services) f(n, t, s);
}

// Everything a service carries, as one string, so that two broadcasts compare exactly.
std::string digest(const Service& s) {
    std::string d;
    auto add = [&d](auto... values) { ((d += std::to_string(values) + ','), ...); };
    d += s.name + s.provider;
    add(s.id, s.type, s.lcn, s.scrambled, s.pmtPid, s.pcrPid, s.caSystems.size());
    for (const Component& c : s.components)
        add(c.pid, c.streamType, c.frameRateMilli, c.compositionPageId), d += c.language;
    for (const Event& e : s.events) {
        add(e.id, e.start, e.duration, e.content, e.parentalRating, e.items.size());
        d += e.name + e.text + e.extendedText;
    }
    for (const DisplaySet& ds : s.subtitles) {
        add(ds.time, ds.pageId, ds.version, ds.state);
        for (const Region& r : ds.regions) d.append(r.pixels.begin(), r.pixels.end());
        for (const Clut& c : ds.cluts)
            for (const ClutEntry& e : c.c8) add(e.y, e.cr, e.cb, e.t);
    }
    for (const TeletextPage& p : s.teletext) {
        add(p.time, p.number, p.subcode, p.controlBits);
        for (const auto& row : p.rows) d.append(row.begin(), row.end());
    }
    return d;
}

std::string digest(const Broadcast& b) {
    std::string d = std::to_string(b.loopMillis) + ',';
    forEachService(b, [&](const Network& n, const Transport& t, const Service& s) {
        d += n.name + std::to_string(t.tsid) + std::to_string(t.tuning.frequencyKHz) + digest(s);
    });
    return d;
}

TEST(Builtin, SameStartGivesTheSameBroadcastAndADayDoesNotDependOnTheStart) {
    EXPECT_EQ(digest(builtinBroadcast(kStart)), digest(broadcast()));
    // An hour later, same day: the schedules are those of the same days.
    const Broadcast later = builtinBroadcast(kStart + 3600);
    std::vector<std::string> a, b;
    forEachService(broadcast(), [&](auto&, auto&, const Service& s) { a.push_back(digest(s)); });
    forEachService(later, [&](auto&, auto&, const Service& s) {
        Service copy = s;
        copy.teletext = {};  // the header clocks differ
        b.push_back(digest(copy));
    });
    for (size_t i = 0; i < a.size(); ++i) EXPECT_EQ(a[i].substr(0, b[i].size()), b[i]);
}

TEST(Builtin, CarriesEnoughOfEveryKind) {
    std::map<Delivery, int> transports;
    std::set<int> positions;
    int services = 0, radio = 0, tv = 0, hd = 0, scrambled = 0;
    for (const Network& n : broadcast().networks) {
        for (const Transport& t : n.transports) {
            EXPECT_EQ(t.tuning.delivery, n.delivery);
            ++transports[n.delivery];
            if (n.delivery == Delivery::Satellite) positions.insert(t.tuning.orbitalPosition);
        }
    }
    forEachService(broadcast(), [&](auto&, auto&, const Service& s) {
        ++services;
        radio += s.type == 0x02;
        tv += s.type == 0x01 || s.type == 0x19;
        hd += s.type == 0x19;
        if (s.scrambled && !s.caSystems.empty()) ++scrambled;
        EXPECT_NE(s.lcn, 0) << s.name;
        EXPECT_FALSE(s.provider.empty()) << s.name;
    });
    EXPECT_GE(transports[Delivery::Satellite], 3);
    EXPECT_GE(positions.size(), 2u);
    EXPECT_GE(transports[Delivery::Cable], 2);
    EXPECT_GE(transports[Delivery::Terrestrial], 3);
    EXPECT_GE(services, 20);
    EXPECT_GT(radio, 0);
    EXPECT_GT(tv, 0);
    EXPECT_GT(hd, 0);
    EXPECT_EQ(scrambled, 1);
}

// Broadcast bytes to UTF-8 by their character-table selector, with iconv.
std::string decode(const std::string& bytes) {
    const char* table = "ISO6937";
    size_t skip = 0;
    char iso[16];
    const auto first = static_cast<unsigned char>(bytes.empty() ? 0x20 : bytes[0]);
    if (first == 0x15) return bytes.substr(1);
    if (first >= 0x01 && first <= 0x0B) {
        snprintf(iso, sizeof iso, "ISO-8859-%d", first + 4);
        table = iso, skip = 1;
    } else if (first == 0x10 && bytes.size() >= 3) {
        snprintf(iso, sizeof iso, "ISO-8859-%d", bytes[2]);
        table = iso, skip = 3;
    }
    iconv_t cd = iconv_open("UTF-8", table);
    std::string in = bytes.substr(skip), out(in.size() * 4, '\0');
    char* ip = in.data();
    char* op = out.data();
    size_t il = in.size(), ol = out.size();
    const size_t r = iconv(cd, &ip, &il, &op, &ol);
    iconv_close(cd);
    return r == static_cast<size_t>(-1) ? "<invalid>" : out.substr(0, out.size() - ol);
}

TEST(Builtin, NamesNeedSeveralCharacterTables) {
    std::map<std::string, char> names;  // decoded name -> first byte of the broadcast bytes
    forEachService(broadcast(), [&](auto&, auto&, const Service& s) {
        names[decode(s.name)] = s.name[0];
        EXPECT_NE(decode(s.provider), "<invalid>");
    });
    const std::pair<const char*, char> expected[] = {
            {"Südwelle HD", 'S'}, {"Straßenfeger Radio", 'S'}, {"Güneş TV", 0x05},
            {"Ελλάδα TV", 0x03},  {"Česká Vlna", 0x10},        {"Łódź TV", 0x10},
            {"Città TV", 0x15},
    };
    for (const auto& [name, selector] : expected) {
        ASSERT_TRUE(names.count(name)) << name;
        EXPECT_EQ(names[name], selector) << name;
    }
}

TEST(Builtin, IdsAndPidsAreUnique) {
    std::set<std::pair<int, int>> transports, services;
    forEachService(broadcast(), [&](auto&, const Transport& t, const Service& s) {
        services.insert({t.onid, s.id});
        transports.insert({t.onid, t.tsid});
    });
    int count = 0;
    forEachService(broadcast(), [&](auto&, auto&, auto&) { ++count; });
    EXPECT_EQ(services.size(), static_cast<size_t>(count));
    size_t transportCount = 0;
    for (const Network& n : broadcast().networks) {
        transportCount += n.transports.size();
        for (const Transport& t : n.transports) {
            std::set<int> pids;
            size_t expected = 0;
            for (const Service& s : t.services) {
                pids.insert(s.pmtPid);
                bool pcrFound = false;
                for (const Component& c : s.components) {
                    pids.insert(c.pid);
                    pcrFound |= c.pid == s.pcrPid;
                    EXPECT_LT(c.pid, 0x1FFF);
                }
                EXPECT_TRUE(pcrFound) << s.name;
                expected += 1 + s.components.size();
            }
            EXPECT_EQ(pids.size(), expected) << t.tsid;
        }
    }
    EXPECT_EQ(transports.size(), transportCount);
}

TEST(Builtin, SchedulesCoverAWeekWithoutGapsOrOverlaps) {
    const int64_t firstDay = kStart - kStart % kDay;
    forEachService(broadcast(), [&](auto&, auto&, const Service& s) {
        ASSERT_FALSE(s.events.empty()) << s.name;
        EXPECT_EQ(s.events.front().start, firstDay);
        std::set<int> ids;
        int64_t end = firstDay;
        for (const Event& e : s.events) {
            EXPECT_EQ(e.start, end) << s.name << " event " << e.id;
            EXPECT_GT(e.duration, 0u);
            EXPECT_FALSE(e.name.empty());
            EXPECT_NE(decode(e.name), "<invalid>");
            ids.insert(e.id);
            end = e.start + e.duration;
        }
        EXPECT_EQ(end, firstDay + 7 * kDay) << s.name;
        EXPECT_EQ(ids.size(), s.events.size());
    });
}

int bitsOf(uint8_t depth) {
    return 2 << (depth - 1);
}

const Component* find(const Service& s, Kind kind) {
    for (const Component& c : s.components)
        if (c.kind == kind) return &c;
    return nullptr;
}

void writePng(const DisplaySet& ds);

TEST(Builtin, DisplaySetsFitTheirDisplayAndTheirColourTables) {
    const bool font = access("/usr/share/fonts/truetype/dejavu/DejaVuSans.ttf", R_OK) == 0;
    std::set<int> depths;
    int services = 0;
    forEachService(broadcast(), [&](auto&, auto&, const Service& s) {
        const Component* sub = find(s, Kind::Subtitle);
        EXPECT_EQ(s.subtitles.empty(), !sub || !font) << s.name;
        if (sub) ++services;
        int64_t last = -1;
        for (const DisplaySet& ds : s.subtitles) {
            EXPECT_GT(ds.time, last);
            EXPECT_LT(ds.time, broadcast().loopMillis);
            last = ds.time;
            EXPECT_EQ(ds.pageId, sub->compositionPageId);
            // The capacity of the decoder's output buffer.
            ASSERT_LE(ds.regions.size(), 5u);
            ASSERT_LE(ds.cluts.size(), 4u);
            ASSERT_EQ(ds.placements.size(), ds.regions.size());
            for (size_t i = 0; i < ds.regions.size(); ++i) {
                const Region& r = ds.regions[i];
                const RegionRef& at = ds.placements[i];
                EXPECT_EQ(at.id, r.id);
                EXPECT_LE(at.x + r.width, ds.displayWidth);
                EXPECT_LE(at.y + r.height, ds.displayHeight);
                ASSERT_EQ(r.pixels.size(), size_t(r.width) * r.height);
                EXPECT_LE(r.pixels.size(), 384000u);
                EXPECT_LE(r.objects.size(), 16u);
                bool clut = false;
                for (const Clut& c : ds.cluts) clut |= c.id == r.clutId;
                EXPECT_TRUE(clut);
                depths.insert(r.depth);
                int glyph = 0, outOfTable = 0;
                for (uint8_t p : r.pixels) {
                    outOfTable += p >= (1 << bitsOf(r.depth));
                    glyph += p > 1;  // above the box colour
                }
                EXPECT_EQ(outOfTable, 0);
                EXPECT_GT(glyph, 100) << "time " << ds.time;
            }
        }
    });
    EXPECT_GE(services, 2);
    if (!font) return;
    EXPECT_EQ(depths, (std::set<int>{1, 2, 3}));
    const DisplaySet* sample = nullptr;
    forEachService(broadcast(), [&](auto&, auto&, const Service& s) {
        for (const DisplaySet& ds : s.subtitles)
            if (!sample && ds.regions.size() == 2) sample = &ds;
    });
    if (sample) writePng(*sample);
}

TEST(Builtin, TeletextPagesAreLevelOneWithWorkingLinks) {
    int services = 0;
    forEachService(broadcast(), [&](auto&, auto&, const Service& s) {
        const Component* ttx = find(s, Kind::Teletext);
        EXPECT_EQ(s.teletext.empty(), ttx == nullptr);
        if (!ttx) return;
        ++services;
        std::set<int> numbers;
        std::map<int, std::set<std::string>> versions;
        uint16_t bits = 0;
        for (const TeletextPage& p : s.teletext) {
            numbers.insert(p.number);
            bits |= p.controlBits;
            std::string text;
            for (const auto& row : p.rows) text.append(row.begin(), row.end());
            versions[p.number].insert(text + char(p.subcode));
            for (char c : text) ASSERT_EQ(c & 0x80, 0);
            // Header: the address columns blank, then the number and the clock of the sending.
            EXPECT_EQ(text.substr(0, 8), std::string(8, ' '));
            const time_t t = kStart + p.time / 1000;
            tm tm{};
            gmtime_r(&t, &tm);
            char header[32];
            snprintf(header, sizeof header, "%03X %02d", p.number, tm.tm_mday);
            EXPECT_EQ(text.substr(19, 6), header);
            strftime(header, sizeof header, "%H:%M:%S", &tm);
            EXPECT_EQ(text.substr(32, 8), header);
        }
        for (const TeletextPage& p : s.teletext)
            for (uint16_t link : p.links) EXPECT_TRUE(link == 0 || numbers.count(link)) << link;
        for (const TeletextRef& ref : ttx->pages)
            EXPECT_TRUE(numbers.count(ref.magazine * 0x100 + ref.page));
        EXPECT_GE(versions[0x101].size(), 3u);   // rotating subpages
        EXPECT_GE(versions[0x888].size(), 10u);  // subtitles that change
        EXPECT_EQ(bits & 0x60, 0x60);            // a newsflash (C5) and a subtitle page (C6)
        const bool german = ttx->language == "deu";
        EXPECT_EQ((bits >> 12) & 7, german ? 4 : 0);  // C12..C14, German: C14
    });
    EXPECT_GE(services, 2);
}

#ifdef DVB_TEST_PNG_DIR
// The display set on a grey picture, colours through the library's own CLUT conversion.
void writePng(const DisplaySet& ds) {
    const int w = ds.displayWidth, h = ds.displayHeight;
    std::vector<uint8_t> rgb(size_t(w) * h * 3, 96);
    for (size_t i = 0; i < ds.regions.size(); ++i) {
        const Region& r = ds.regions[i];
        const Clut* clut = &ds.cluts[0];
        for (const Clut& c : ds.cluts)
            if (c.id == r.clutId) clut = &c;
        for (int y = 0; y < r.height; ++y) {
            for (int x = 0; x < r.width; ++x) {
                const uint8_t p = r.pixels[size_t(y) * r.width + x];
                const ClutEntry e = r.depth == 1   ? clut->c2[p & 3]
                                    : r.depth == 2 ? clut->c4[p & 15]
                                                   : clut->c8[p];
                const int a = YCC2RGB_A(e.y, e.t);
                uint8_t* o =
                        &rgb[(size_t(ds.placements[i].y + y) * w + ds.placements[i].x + x) * 3];
                const int c[3] = {YCC2RGB_R(e.y, e.cr, e.cb), YCC2RGB_G(e.y, e.cr, e.cb),
                                  YCC2RGB_B(e.y, e.cr, e.cb)};
                for (int k = 0; k < 3; ++k) o[k] = uint8_t((c[k] * a + o[k] * (255 - a)) / 255);
            }
        }
    }
    png_image image{};
    image.version = PNG_IMAGE_VERSION;
    image.width = w;
    image.height = h;
    image.format = PNG_FORMAT_RGB;
    png_image_write_to_file(&image, DVB_TEST_PNG_DIR "/builtin-subtitle.png", 0, rgb.data(), 0,
                            nullptr);
}
#else
void writePng(const DisplaySet&) {}
#endif

}  // namespace
#endif
