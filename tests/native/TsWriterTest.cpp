#include <broadcast/Builtin.h>
#include <broadcast/TsReader.h>
#include <broadcast/TsWriter.h>
#include <gtest/gtest.h>
#include "Captures.h"
// libdvbpsi's headers each need the ones before them: the core first, then the descriptors.
#include <dvbpsi/dvbpsi.h>

#include <dvbpsi/descriptor.h>

#include <dvbpsi/demux.h>
#include <dvbpsi/eit.h>

#include <algorithm>
#include <string>
#include <tuple>

using namespace dvbmodel;
using namespace testdata;

namespace {

constexpr int64_t kStart = 1709323200000;  // 2024-03-01T20:00:00Z

// Everything of a service that its transport's SI and PIDs carry, as one comparable text.
std::string describe(const Service& s, int64_t from, int64_t to) {
    std::string d;
    auto add = [&d](auto... values) { ((d += std::to_string(values) + ','), ...); };
    d += s.name + '|' + s.provider + '|';
    add(s.id, s.type, s.lcn, s.visible, s.scrambled, s.pmtPid, s.pcrPid);
    for (uint16_t ca : s.caSystems) add(ca);
    for (const Component& c : s.components) {
        d += "\n  component " + c.language + ' ';
        // A sequence header gives MPEG video's size; H.264's is in its parameter sets, not read.
        add(int(c.kind), c.pid, c.streamType, c.ac3, c.eac3, c.subtitlingType, c.compositionPageId,
            c.ancillaryPageId, c.frameRateMilli, c.streamType == 0x02 ? c.width : 0,
            c.streamType == 0x02 ? c.height : 0);
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

// Every transport of the built-in broadcast, written and read back by our reader: the same
// model, field by field, with what a transport stream does not carry named where the
// comparison leaves it out; and read by ffprobe, an independent reader, as the model says.
TEST(TsWriter, EveryBuiltinTransportReadsBackToTheSameModelAndInFfprobe) {
    const int64_t spanMs = 12000;  // every table at least once, the schedule too
    const bool ffprobe = std::system("ffprobe -version >/dev/null 2>&1") == 0;
    TempDir dir;
    Broadcast b = builtinBroadcast(kStart / 1000);
    // What the built-in broadcast does not use: H.264 at 59.94 Hz (its frames fall between
    // milliseconds), a multiplex of 5 MHz.
    b.networks[0].transports[1].services[1].components[0].frameRateMilli = 59940;
    b.networks[3].transports[2].tuning.bandwidthKHz = 5000;
    const int64_t midnight = kStart / 1000 / 86400 * 86400;
    size_t pages = 0;
    for (const Network& n : b.networks)
        for (const Transport& t : n.transports) {
            SCOPED_TRACE("transport " + std::to_string(t.tsid));
            std::vector<uint8_t> ts;
            TsWriterState state;
            TsWriterOptions options;
            options.videoBitRate = 8000;  // pictures are not compared: keep the stream small
            writeTransport(b, n, t, kStart, spanMs, ts, state, options);
            EXPECT_EQ(state.stats().sectionsDropped + state.stats().itemsDropped, 0u);
            if (ffprobe) {
                EXPECT_EQ(probe(dir.write("tp.ts", ts)), expected(t));
            }
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
            const Transport* rt = nullptr;
            for (const Network& m : c.networks)
                for (const Transport& u : m.transports)
                    if (u.onid == t.onid && u.tsid == t.tsid) rn = &m, rt = &u;
            ASSERT_NE(rt, nullptr);
            EXPECT_EQ(std::tie(rn->id, rn->name, rn->delivery), std::tie(n.id, n.name, n.delivery));
            const Tuning &a = rt->tuning, &w = t.tuning;
            EXPECT_EQ(std::make_tuple(a.delivery, a.frequencyKHz, a.symbolRate, a.modulation, a.fec,
                                      a.polarization, a.orbitalPosition, a.bandwidthKHz),
                      std::make_tuple(w.delivery, w.frequencyKHz, w.symbolRate, w.modulation, w.fec,
                                      w.polarization, w.orbitalPosition, w.bandwidthKHz));
            ASSERT_EQ(rt->services.size(), t.services.size());
            for (size_t i = 0; i < t.services.size(); ++i) {
                const Service &want = t.services[i], &got = rt->services[i];
                EXPECT_EQ(describe(got, midnight, midnight + 8 * 86400),
                          describe(want, midnight, midnight + 8 * 86400));
                // Timed content: each display set and teletext sending read back is the model's
                // one of its loop time plus the PTS's decode delay (times count from the span).
                for (const DisplaySet& ds : got.subtitles) {
                    auto same = [&](const DisplaySet& m) {
                        return m.time + kTsDecodeDelayMs == ds.time && describe(m) == describe(ds);
                    };
                    EXPECT_TRUE(std::any_of(want.subtitles.begin(), want.subtitles.end(), same))
                            << want.id << " display set at " << ds.time;
                }
                for (const TeletextPage& p : got.teletext) {
                    auto same = [&](const TeletextPage& m) {
                        return std::tie(m.number, m.subcode, m.controlBits, m.rows[1], m.rows[23],
                                        m.links) == std::tie(p.number, p.subcode, p.controlBits,
                                                             p.rows[1], p.rows[23], p.links) &&
                               m.time + kTsDecodeDelayMs == p.time;
                    };
                    EXPECT_TRUE(std::any_of(want.teletext.begin(), want.teletext.end(), same))
                            << want.id << " page " << std::hex << p.number;
                    ++pages;
                }
            }
        }
    EXPECT_GT(pages, 0u);
    NEED_FFPROBE();
}

// Running status and version of the p/f tables, which only another receiver reads: our reader
// takes every section and leaves the running status to the receiver's clock.
TEST(TsWriter, PresentFollowingTablesCarryRunningStatusAndANewVersionInLibdvbpsi) {
    Broadcast b = builtinBroadcast(kStart / 1000);
    const Transport& tp = b.networks[0].transports[0];
    // The first service's present event ends 5 s into the span: its p/f then takes version 1.
    const Event* ending = eventAt(tp.services[0], kStart / 1000 + 7 * 3600);
    std::vector<uint8_t> ts;
    TsWriterState state;
    writeTransport(b, b.networks[0], tp, (ending->start + ending->duration) * 1000 - 5000, 10000,
                   ts, state);
    std::vector<dvbpsi_eit_t*> pf;
    dvbpsi_t* h = dvbpsi_new(nullptr, DVBPSI_MSG_NONE);
    auto attach = [](dvbpsi_t* d, uint8_t table, uint16_t ext, void* list) {
        auto keep = [](void* to, dvbpsi_eit_t* t) {
            static_cast<std::vector<dvbpsi_eit_t*>*>(to)->push_back(t);
        };
        if (table == 0x4E) dvbpsi_eit_attach(d, table, ext, +keep, list);
    };
    dvbpsi_AttachDemux(h, +attach, &pf);
    for (size_t i = 0; i + 188 <= ts.size(); i += 188)
        if (((ts[i + 1] & 0x1F) << 8 | ts[i + 2]) == 0x12) dvbpsi_packet_push(h, &ts[i]);
    dvbpsi_DetachDemux(h);
    dvbpsi_delete(h);
    std::vector<std::array<int, 5>> got,
            want = {{0, ending[0].id, 4, ending[1].id, 1}, {1, ending[1].id, 4, ending[2].id, 1}};
    for (dvbpsi_eit_t* t : pf) {
        const dvbpsi_eit_event_t* e = t->p_first_event;
        if (t->i_extension == tp.services[0].id && e && e->p_next)
            got.push_back({t->i_version, int(e->i_event_id), e->i_running_status,
                           int(e->p_next->i_event_id), e->p_next->i_running_status});
        dvbpsi_eit_delete(t);
    }
    got.erase(std::unique(got.begin(), got.end()), got.end());
    EXPECT_EQ(got, want);
}

TEST(TsWriter, SpansJoinIntoTheStreamOfOneSpan) {
    Broadcast b = builtinBroadcast(kStart / 1000);
    const Network& net = b.networks[0];
    const Transport& tp = net.transports[0];
    // Across a UTC midnight: the schedule's day moves and the subtitle loop starts again.
    int64_t from = (kStart / 86400000 + 1) * 86400000 - 1700;
    std::vector<uint8_t> whole;
    TsWriterState one;
    writeTransport(b, net, tp, from, 3400, whole, one);
    for (const auto& cuts :
         std::vector<std::vector<int64_t>>{{1700}, {0, 1, 699, 1999, 3399}, {37, 40, 2000}}) {
        std::vector<uint8_t> pieces;
        TsWriterState state;
        int64_t at = 0;
        for (int64_t cut : cuts)
            writeTransport(b, net, tp, from + at, cut - at, pieces, state), at = cut;
        writeTransport(b, net, tp, from + at, 3400 - at, pieces, state);
        EXPECT_TRUE(pieces == whole)
                << cuts.size() << " cuts: " << pieces.size() << " bytes, not " << whole.size();
    }
}

// Without a PCR a capture's length comes from its PTS, which may wrap round 2^33 within it.
TEST(TsReader, APtsCaptureAcrossThePtsWrapLastsWhatItHolds) {
    Broadcast b = builtinBroadcast(kStart / 1000);
    Transport tp = b.networks[0].transports[0];
    for (Service& s : tp.services) s.pcrPid = 0x1FFF;
    const int64_t wrap = ((kStart * 90 >> 33) + 1) * (int64_t{1} << 33) / 90;
    std::vector<uint8_t> ts;
    TsWriterState state;
    writeTransport(b, b.networks[0], tp, wrap - 1000, 2000, ts, state);
    TsCapture c;
    TsReadStats stats;
    std::string error;
    ASSERT_TRUE(readTransportStream(ts.data(), ts.size(), "wrap", c, error, stats)) << error;
    EXPECT_NEAR(c.ptsDurationMs, 2000, 100);
}

}  // namespace

// An SD MPEG video frame at the default bit rate carries a test card: ffmpeg decodes its 75%
// colour bars (ITU-R BT.601 values) and its grey ramp from 16 to 235.
TEST(TsWriter, MpegVideoCarriesATestCardThatFfmpegDecodes) {
    NEED_FFPROBE();
    Broadcast b = builtinBroadcast(kStart / 1000);
    const Network& net = b.networks[0];
    TsWriterOptions options;
    options.only = &net.transports[0].services[2];
    ASSERT_EQ(options.only->components.at(0).streamType, 0x02);  // MPEG-2 video
    std::vector<uint8_t> ts;
    TsWriterState state;
    writeTransport(b, net, net.transports[0], kStart, 1000, ts, state, options);
    TempDir dir;
    const std::string yuv = run("ffmpeg -v error -i '" + dir.write("card.ts", ts) +
                                "' -map 0:v:0 -frames:v 1 -f rawvideo -pix_fmt yuv420p -");
    const int w = 720, h = 576;
    ASSERT_EQ(yuv.size(), size_t(w * h * 3 / 2));
    auto at = [&](int x, int y) {
        const size_t chroma = size_t(y / 2 * w / 2 + x / 2);
        return std::array<int, 3>{uint8_t(yuv[size_t(y * w + x)]), uint8_t(yuv[w * h + chroma]),
                                  uint8_t(yuv[w * h * 5 / 4 + chroma])};
    };
    // The eight bars, then the ramp's ends.
    const std::vector<std::array<int, 3>> want = {
            {180, 128, 128}, {162, 44, 142}, {131, 156, 44}, {112, 72, 58},  {84, 184, 198},
            {65, 100, 212},  {35, 212, 114}, {16, 128, 128}, {16, 128, 128}, {235, 128, 128}};
    std::vector<std::array<int, 3>> got;
    for (int i = 0; i < 8; ++i) got.push_back(at((2 * i + 1) * w / 16, 40));
    got.push_back(at(8, h - 8)), got.push_back(at(w - 8, h - 8));
    for (size_t i = 0; i < want.size(); ++i)
        for (int k = 0; k < 3; ++k) EXPECT_NEAR(got[i][k], want[i][k], 2) << i << ' ' << k;
}
