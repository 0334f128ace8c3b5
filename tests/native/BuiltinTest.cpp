// The built-in broadcast: deterministic, as large as a newcomer needs, internally consistent.
#if DVB_RECEIVER
#include <gtest/gtest.h>
#include <iconv.h>
#include <time.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <map>
#include <set>
#include <string>

#include "broadcast/Builtin.h"

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

const Component* find(const Service& s, Kind kind) {
    for (const Component& c : s.components)
        if (c.kind == kind) return &c;
    return nullptr;
}

// Everything the broadcast carries, service by service, so that two broadcasts compare exactly.
std::vector<std::string> digest(const Broadcast& b, bool teletext) {
    std::vector<std::string> out{std::to_string(b.loopMillis)};
    forEachService(b, [&](auto&, auto&, const Service& s) {
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
        for (const TeletextPage& p : teletext ? s.teletext : std::vector<TeletextPage>{}) {
            add(p.time, p.number, p.subcode, p.controlBits);
            for (const auto& row : p.rows) d.append(row.begin(), row.end());
        }
        out.push_back(d);
    });
    return out;
}

TEST(Builtin, SameStartGivesTheSameBroadcastAndADayDoesNotDependOnTheStart) {
    EXPECT_EQ(digest(builtinBroadcast(kStart), true), digest(broadcast(), true));
    // An hour later, same day: the schedules are those of the same days; only the teletext
    // headers' clocks differ.
    EXPECT_EQ(digest(builtinBroadcast(kStart + 3600), false), digest(broadcast(), false));
}

// Broadcast bytes to UTF-8 by their character-table selector, with iconv.
std::string decode(const std::string& bytes) {
    const auto first = static_cast<unsigned char>(bytes.empty() ? 0x20 : bytes[0]);
    if (first == 0x15) return bytes.substr(1);
    char table[16] = "ISO6937";
    size_t skip = first >= 0x01 && first <= 0x0B ? 1 : first == 0x10 && bytes.size() >= 3 ? 3 : 0;
    if (skip) snprintf(table, sizeof table, "ISO-8859-%d", skip == 1 ? first + 4 : bytes[2]);
    iconv_t cd = iconv_open("UTF-8", table);
    std::string in = bytes.substr(skip), out(in.size() * 4, '\0');
    char *ip = in.data(), *op = out.data();
    size_t il = in.size(), ol = out.size();
    const size_t r = iconv(cd, &ip, &il, &op, &ol);
    iconv_close(cd);
    return r == static_cast<size_t>(-1) ? "<invalid>" : out.substr(0, out.size() - ol);
}

// Counts of every kind, unique ids and PIDs, names in several character tables (read by iconv),
// and a week of events per service without gaps or overlaps.
TEST(Builtin, CarriesEnoughOfEveryKindWithUniqueIdsAndAWeekOfEvents) {
    std::map<Delivery, int> transports;
    std::set<int> positions;
    std::set<std::pair<int, int>> tsids, sids;  // each unique
    std::map<std::string, char> names;          // decoded name -> first byte of the broadcast bytes
    int services = 0, radio = 0, tv = 0, hd = 0, scrambled = 0;
    const int64_t firstDay = kStart - kStart % kDay;
    for (const Network& n : broadcast().networks)
        for (const Transport& t : n.transports) {
            EXPECT_EQ(t.tuning.delivery, n.delivery);
            ++transports[n.delivery];
            EXPECT_TRUE(tsids.insert({t.onid, t.tsid}).second) << t.tsid;
            if (n.delivery == Delivery::Satellite) positions.insert(t.tuning.orbitalPosition);
            std::set<int> pids;
            size_t expected = 0;
            for (const Service& s : t.services) {
                pids.insert(s.pmtPid);
                for (const Component& c : s.components) pids.insert(c.pid);
                EXPECT_TRUE(std::any_of(s.components.begin(), s.components.end(), [&](auto& c) {
                    return c.pid == s.pcrPid;
                })) << s.name;
                expected += 1 + s.components.size();
                ++services, radio += s.type == 0x02, tv += s.type == 0x01 || s.type == 0x19;
                hd += s.type == 0x19, scrambled += s.scrambled && !s.caSystems.empty();
                EXPECT_TRUE(sids.insert({t.onid, s.id}).second) << s.name;
                names[decode(s.name)] = s.name[0];
                EXPECT_TRUE(!s.provider.empty() && decode(s.provider) != "<invalid>") << s.name;
                EXPECT_NE(s.lcn, 0) << s.name;
                ASSERT_FALSE(s.events.empty()) << s.name;
                std::set<int> ids;
                int64_t end = firstDay;
                for (const Event& e : s.events) {
                    EXPECT_EQ(e.start, end) << s.name << " event " << e.id;
                    EXPECT_GT(e.duration, 0u);
                    EXPECT_TRUE(!e.name.empty() && decode(e.name) != "<invalid>") << e.id;
                    EXPECT_TRUE(ids.insert(e.id).second) << e.id;
                    end = e.start + e.duration;
                }
                EXPECT_EQ(end, firstDay + 7 * kDay) << s.name;
            }
            EXPECT_EQ(pids.size(), expected) << t.tsid;
            EXPECT_LT(*pids.rbegin(), 0x1FFF) << t.tsid;
        }
    EXPECT_TRUE(transports[Delivery::Satellite] >= 3 && positions.size() >= 2 &&
                transports[Delivery::Cable] >= 2 && transports[Delivery::Terrestrial] >= 3 &&
                services >= 20 && radio && tv && hd);
    EXPECT_EQ(scrambled, 1);
    const std::pair<const char*, char> expected[] = {
            {"Südwelle HD", 'S'}, {"Straßenfeger Radio", 'S'}, {"Güneş TV", 0x05},
            {"Ελλάδα TV", 0x03},  {"Česká Vlna", 0x10},        {"Łódź TV", 0x10},
            {"Città TV", 0x15},
    };
    for (const auto& [name, selector] : expected) EXPECT_EQ(names[name], selector) << name;
}

TEST(Builtin, DisplaySetsFitTheirDisplayAndTheirColourTables) {
    const bool font = access("/usr/share/fonts/truetype/dejavu/DejaVuSans.ttf", R_OK) == 0;
    std::set<int> depths;
    int services = 0;
    forEachService(broadcast(), [&](auto&, auto&, const Service& s) {
        const Component* sub = find(s, Kind::Subtitle);
        EXPECT_EQ(s.subtitles.empty(), !sub || !font) << s.name;
        services += sub != nullptr;
        int64_t last = -1;
        for (const DisplaySet& ds : s.subtitles) {
            EXPECT_TRUE(ds.time > last && ds.time < broadcast().loopMillis) << ds.time;
            last = ds.time;
            EXPECT_EQ(ds.pageId, sub->compositionPageId);
            // The capacity of the decoder's output buffer.
            ASSERT_TRUE(ds.regions.size() <= 5 && ds.cluts.size() <= 4);
            ASSERT_EQ(ds.placements.size(), ds.regions.size());
            for (size_t i = 0; i < ds.regions.size(); ++i) {
                const Region& r = ds.regions[i];
                const RegionRef& at = ds.placements[i];
                EXPECT_EQ(at.id, r.id);
                EXPECT_LE(at.x + r.width, ds.displayWidth);
                EXPECT_LE(at.y + r.height, ds.displayHeight);
                ASSERT_EQ(r.pixels.size(), size_t(r.width) * r.height);
                EXPECT_TRUE(r.pixels.size() <= 384000 && r.objects.size() <= 16);
                EXPECT_TRUE(std::any_of(ds.cluts.begin(), ds.cluts.end(),
                                        [&](auto& c) { return c.id == r.clutId; }));
                depths.insert(r.depth);
                int glyph = 0;  // pixels above the box colour
                for (uint8_t p : r.pixels) glyph += p > 1;
                EXPECT_LT(*std::max_element(r.pixels.begin(), r.pixels.end()),
                          1 << (2 << (r.depth - 1)));
                EXPECT_GT(glyph, 100) << "time " << ds.time;
            }
        }
    });
    EXPECT_GE(services, 2);
    EXPECT_EQ(depths, (font ? std::set<int>{1, 2, 3} : std::set<int>{}));
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
        EXPECT_EQ((bits >> 12) & 7, ttx->language == "deu" ? 4 : 0);  // C12..C14, German: C14
    });
    EXPECT_GE(services, 2);
}

}  // namespace
#endif
