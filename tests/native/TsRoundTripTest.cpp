// The built-in broadcast written as transport streams and read back: the same model, field by
// field, with what a transport stream does not carry named where the comparison leaves it out.
#include <broadcast/Builtin.h>
#include <broadcast/TsReader.h>
#include <broadcast/TsWriter.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <tuple>

using namespace dvbmodel;

namespace {

// Everything of a service that its transport's SI and PIDs carry, as one comparable text.
std::string describe(const Service& s, int64_t from, int64_t to) {
    std::string d;
    auto add = [&d](auto... values) { ((d += std::to_string(values) + ','), ...); };
    d += s.name + '|' + s.provider + '|';
    add(s.id, s.type, s.lcn, s.visible, s.scrambled, s.pmtPid, s.pcrPid);
    for (uint16_t ca : s.caSystems) add(ca);
    for (const Component& c : s.components) {
        d += "\n  component " + c.language + ' ';
        add(int(c.kind), c.pid, c.streamType, c.ac3, c.eac3, c.subtitlingType, c.compositionPageId,
            c.ancillaryPageId);
        for (const TeletextRef& p : c.pages) add(p.type, p.magazine, p.page);
    }
    // The schedule goes out for 8 days from the UTC midnight of the span.
    for (const Event& e : s.events) {
        if (e.start + int64_t{e.duration} <= from || e.start >= to) continue;
        d += "\n  event " + e.language + '|' + e.name + '|' + e.text + '|' + e.extendedText + '|';
        add(e.id, e.start, e.duration, e.content, e.parentalRating);
        for (const Item& i : e.items) d += i.description + '=' + i.text + ';';
    }
    return d;
}

// What a display set shows: its page, and each placed region where it is with its pixels (a
// decoder also holds the epoch's regions that no placement shows).
std::string describe(const DisplaySet& ds) {
    std::string d = std::to_string(ds.pageId) + ',' + std::to_string(ds.state) + ',';
    for (const RegionRef& p : ds.placements) {
        d += std::to_string(p.id) + '@' + std::to_string(p.x) + ',' + std::to_string(p.y) + ';';
        for (const Region& r : ds.regions) {
            if (r.id != p.id) continue;
            d += std::to_string(r.width) + 'x' + std::to_string(r.height) + ',';
            d.append(r.pixels.begin(), r.pixels.end());
        }
    }
    return d;
}

const Transport* find(const std::vector<Network>& networks, uint16_t onid, uint16_t tsid,
                      const Network** network = nullptr) {
    for (const Network& n : networks)
        for (const Transport& t : n.transports)
            if (t.onid == onid && t.tsid == tsid) return network && (*network = &n), &t;
    return nullptr;
}

}  // namespace

TEST(TsRoundTrip, EveryBuiltinTransportReadsBackToTheSameModel) {
    const int64_t startMs = 1709323200000;  // 2024-03-01T20:00:00Z
    const int64_t spanMs = 12000;           // every table at least once, the schedule too
    Broadcast b = builtinBroadcast(startMs / 1000);
    const int64_t midnight = startMs / 1000 / 86400 * 86400;
    size_t subtitles = 0, pages = 0;
    for (const Network& n : b.networks) {
        for (const Transport& t : n.transports) {
            std::vector<uint8_t> ts;
            TsWriterState state;
            TsWriterOptions options;
            options.videoBitRate = 8000;  // pictures are not compared: keep the stream small
            writeTransport(b, n, t, startMs, spanMs, ts, state, options);
            TsCapture c;
            TsReadStats stats;
            std::string error;
            ASSERT_TRUE(readTransportStream(ts.data(), ts.size(), "written", c, error, stats))
                    << error;
            EXPECT_EQ(stats.crcErrors + stats.continuityErrors + stats.tablesDropped +
                              stats.descriptorsDropped + stats.pesDropped,
                      0u)
                    << formatTsReadStats(stats);
            const Network* rn = nullptr;
            const Transport* rt = find(c.networks, t.onid, t.tsid, &rn);
            ASSERT_NE(rt, nullptr) << t.tsid;
            EXPECT_EQ(std::tie(rn->id, rn->name, rn->delivery), std::tie(n.id, n.name, n.delivery));
            const Tuning &a = rt->tuning, &w = t.tuning;
            EXPECT_EQ(std::make_tuple(a.delivery, a.frequencyKHz, a.symbolRate, a.modulation, a.fec,
                                      a.polarization, a.orbitalPosition, a.bandwidthKHz),
                      std::make_tuple(w.delivery, w.frequencyKHz, w.symbolRate, w.modulation, w.fec,
                                      w.polarization, w.orbitalPosition, w.bandwidthKHz))
                    << t.tsid;
            ASSERT_EQ(rt->services.size(), t.services.size());
            for (size_t i = 0; i < t.services.size(); ++i) {
                const Service &want = t.services[i], &got = rt->services[i];
                EXPECT_EQ(describe(got, midnight, midnight + 8 * 86400),
                          describe(want, midnight, midnight + 8 * 86400));
                // Timed content: each display set and teletext sending read back is the model's
                // one of its time within the loop.
                for (const DisplaySet& ds : got.subtitles) {
                    // Times count from the first PCR, the span's start: the loop's time plus
                    // the decode delay of the PTS.
                    auto same = [&](const DisplaySet& m) {
                        return m.time + kTsDecodeDelayMs == ds.time && describe(m) == describe(ds);
                    };
                    EXPECT_TRUE(std::any_of(want.subtitles.begin(), want.subtitles.end(), same))
                            << want.id << " display set at " << ds.time;
                    ++subtitles;
                }
                for (const TeletextPage& p : got.teletext) {
                    auto same = [&](const TeletextPage& m) {
                        return m.number == p.number && m.subcode == p.subcode &&
                               m.controlBits == p.controlBits && m.rows[1] == p.rows[1] &&
                               m.rows[23] == p.rows[23] && m.links == p.links;
                    };
                    EXPECT_TRUE(std::any_of(want.teletext.begin(), want.teletext.end(), same))
                            << want.id << " page " << std::hex << p.number;
                    ++pages;
                }
            }
        }
    }
    EXPECT_GT(subtitles, 0u);
    EXPECT_GT(pages, 0u);
}
