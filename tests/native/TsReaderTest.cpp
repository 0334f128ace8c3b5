// The transport-stream reader on real captures against their truth files (libdvbpsi, iconv and
// a segment reader made them, not this reader), and the broadcast setting's errors.
#include <gtest/gtest.h>

#include <algorithm>
#include <ctime>
#include <map>
#include <set>
#include <sstream>
#include <tuple>

#include "Captures.h"
#include "broadcast/BroadcastSource.h"
#include "broadcast/DvbText.h"

using namespace dvbmodel;
using namespace testdata;
using nlohmann::json;

namespace {

int64_t utc(const std::string& iso) {  // 2019-01-22T12:30:00Z
    std::tm tm{};
    strptime(iso.c_str(), "%Y-%m-%dT%H:%M:%SZ", &tm);
    return timegm(&tm);
}

struct Loaded {
    Broadcast b;
    TsReadStats stats;
    std::map<std::tuple<int, int, int>, const Service*> services;  // onid, tsid, sid
};

Loaded load(const std::string& setting) {
    Loaded l;
    std::string error;
    EXPECT_TRUE(loadBroadcast(setting, 0, l.b, error, &l.stats)) << error;
    for (const Network& n : l.b.networks)
        for (const Transport& t : n.transports)
            for (const Service& s : t.services) l.services[{t.onid, t.tsid, s.id}] = &s;
    return l;
}

}  // namespace

TEST(TsReader, FrenchMultiplexMatchesItsTruth) {
    NEED_CAPTURE("fr-dvbt-multiplex-si.ts");
    const json t = truth("fr-dvbt-multiplex-si");
    TempDir dir;
    const std::string rel = fs::relative(kDir + "/fr-dvbt-multiplex-si.ts", dir.path);
    const Loaded l = load(dir.write(
            "fr.broadcast", "# the French multiplex R4\n" + rel + "  terrestrial 482000 7000\n"));
    EXPECT_EQ(l.b.start, utc(t["time"]["tdt_first_utc"]));
    EXPECT_EQ(l.b.loopMillis,
              1000 * (utc(t["time"]["tdt_last_utc"]) - utc(t["time"]["tdt_first_utc"])));

    // SDT actual and other: every service with its type and name bytes.
    size_t services = 0;
    for (const json& sdt : t["sdt"])
        for (const json& s : sdt["services"]) {
            const Service* got = l.services.at({sdt["onid"], sdt["tsid"], s["sid"]});
            EXPECT_EQ(std::tie(got->name, got->provider, got->scrambled, got->type),
                      std::make_tuple(unhex(s["name"]["hex"]), unhex(s["provider"]["hex"]),
                                      s["free_ca_mode"] == 1, uint8_t(s["service_type"])))
                    << s["sid"];
            ++services;
        }
    EXPECT_EQ(services, 46u);

    // NIT: the network, its transports in order, their LCNs.
    const json& nit = t["nit"][0];
    const Network& net = l.b.networks.at(0);
    EXPECT_EQ(net.id, nit["network_id"]);
    EXPECT_EQ(net.name, unhex(nit["network_name"]["hex"]));
    ASSERT_GE(net.transports.size(), nit["transport_streams"].size());
    for (size_t i = 0; i < nit["transport_streams"].size(); ++i) {
        const json& ts = nit["transport_streams"][i];
        const Transport& got = net.transports[i];
        EXPECT_EQ(std::make_tuple(int(got.tsid), int(got.onid), got.tuning.delivery),
                  std::make_tuple(int(ts["tsid"]), int(ts["onid"]), Delivery::Terrestrial));
        for (const json& lcn : ts["lcn_0x83"]) {
            const auto key = std::make_tuple(int(ts["onid"]), int(ts["tsid"]), int(lcn["sid"]));
            if (l.services.count(key) == 0) continue;  // listed, but in no SDT
            EXPECT_EQ(l.services.at(key)->lcn, lcn["lcn"]) << lcn["sid"];
            EXPECT_EQ(l.services.at(key)->visible, lcn["visible"] == 1);
        }
    }

    // Every centre frequency in the NIT is 0xFFFFFFFF: the file tunes tsid 4, the frequency rule
    // the others, skipping 482000.
    std::map<int, std::pair<uint32_t, uint32_t>> tunings,  // tsid: kHz, bandwidth
            rule = {{1, {474000, 8000}},  {2, {490000, 8000}},  {3, {498000, 8000}},
                    {4, {482000, 7000}},  {6, {506000, 8000}},  {8, {514000, 8000}},
                    {10, {522000, 8000}}, {13, {530000, 8000}}, {15, {538000, 8000}}};
    for (const Transport& tp : net.transports)
        tunings[tp.tsid] = {tp.tuning.frequencyKHz, tp.tuning.bandwidthKHz};
    EXPECT_EQ(tunings, rule);

    // EIT present/following and schedule: every event of every service, merged by event id.
    std::map<const Service*, std::set<int>> ids;
    auto check = [&](const json& svc, const json& e, int64_t duration, const json& name,
                     const json& text, const json& ext) {
        const Service* s = l.services.at({svc["onid"], svc["tsid"], svc["sid"]});
        const auto got = std::find_if(s->events.begin(), s->events.end(),
                                      [&](const Event& x) { return x.id == e["event_id"]; });
        ASSERT_NE(got, s->events.end()) << svc["sid"] << " " << e["event_id"];
        ids[s].insert(int(e["event_id"]));
        EXPECT_EQ(got->start, utc(e["start_utc"])) << e["event_id"];
        EXPECT_EQ(got->duration, duration) << e["event_id"];
        EXPECT_EQ(got->name, unhex(name)) << e["event_id"];
        EXPECT_EQ(decodeText(got->text), text) << e["event_id"];
        EXPECT_EQ(decodeText(got->extendedText), ext.empty() ? "" : ext.begin().value());
    };
    for (const auto& [name, svc] : t["eit_pf"]["services"].items())
        for (const char* part : {"present", "following"})
            for (const json& e : svc.value(part, json::object()).value("events", json::array())) {
                const json& se = e["short_events"][0];
                check(svc, e, e["duration"]["seconds"], se["name"]["hex"], se["text"]["utf8"],
                      e.value("extended_text_concatenated", json::object()));
            }
    for (const auto& [name, svc] : t["eit_schedule"]["services"].items()) {
        for (const json& e : svc["events"])
            check(svc, e, utc("1970-01-01T" + e["duration"].get<std::string>() + "Z"),
                  e["name_hex"], e["text_utf8"], e["extended_text_utf8"]);
        // The schedule's sections as received, each with the events it listed.
        std::set<std::pair<int, int>> want, got;
        for (const auto& [table, numbers] : svc["sections_seen"].items())
            for (int n : numbers) want.insert({std::stoi(table, nullptr, 16), n});
        size_t listed = 0;
        for (const EitSection& e :
             l.services.at({svc["onid"], svc["tsid"], svc["sid"]})->eitSections)
            got.insert({e.tableId, e.number}), listed += e.events.size();
        EXPECT_EQ(got, want) << name;
        EXPECT_GE(listed, svc["unique_event_count"].get<size_t>()) << name;
    }
    for (const auto& [s, set] : ids) EXPECT_EQ(s->events.size(), set.size()) << s->id;
    // A clean capture: nothing dropped but the one EIT section whose CRC fails.
    const TsReadStats& d = l.stats;
    EXPECT_EQ(d.continuityErrors + d.transportErrors + d.syncLosses + d.tablesDropped +
                      d.descriptorsDropped + d.eventsDropped + d.pesDropped,
              0u);
}

// The components of the PMT; the display set the PID carries is the decoder's own test's and the
// end-to-end test's business.
TEST(TsReader, CanalPlusServiceComponents) {
    NEED_CAPTURE("dvbsub-canalplus-cinema.ts");
    const json t = truth("dvbsub-canalplus-cinema");
    const Loaded l = load(kDir + "/dvbsub-canalplus-cinema.ts");
    const json& pmt = t["pmts"][0];
    const json& sdt = t["sdt"][0]["services"][0];
    const Service* s = l.services.at({t["sdt"][0]["onid"], t["sdt"][0]["tsid"], sdt["sid"]});
    EXPECT_EQ(s->pmtPid, pmt["pmt_pid"]);
    EXPECT_EQ(s->pcrPid, pmt["pcr_pid"]);
    std::set<uint16_t> ca;
    for (const json& c : pmt["ca"])
        ca.insert(uint16_t(std::stoi(c["ca_system_id"].get<std::string>(), nullptr, 16)));
    EXPECT_EQ(std::set<uint16_t>(s->caSystems.begin(), s->caSystems.end()), ca);
    ASSERT_EQ(s->components.size(), pmt["components"].size());
    for (size_t i = 0; i < s->components.size(); ++i) {
        const json& c = pmt["components"][i];
        const Component& got = s->components[i];
        const std::string kind = c["kind"];
        EXPECT_EQ(got.pid, c["pid"]);
        EXPECT_EQ(got.streamType, c["stream_type"]);
        EXPECT_EQ(got.kind, kind == "video"               ? Kind::Video
                            : kind.rfind("audio", 0) == 0 ? Kind::Audio
                            : kind == "dvb_subtitle"      ? Kind::Subtitle
                                                          : Kind::Data);
        EXPECT_EQ(got.ac3, kind == "audio AC-3");
        if (c.contains("languages")) {
            EXPECT_EQ(got.language, c["languages"][0]["lang"]);
        }
        if (!c.contains("subtitling")) continue;
        EXPECT_EQ(got.language, c["subtitling"][0]["lang"]);
        EXPECT_EQ(got.subtitlingType, c["subtitling"][0]["subtitling_type"]);
        EXPECT_EQ(got.compositionPageId, c["subtitling"][0]["composition_page_id"]);
        EXPECT_EQ(got.ancillaryPageId, c["subtitling"][0]["ancillary_page_id"]);
    }
}

TEST(TsReader, DamagedCaptureKeepsWhatIsSoundAndCountsTheRest) {
    NEED_CAPTURE("damaged-subtitles-teletext.ts");
    const json t = truth("damaged-subtitles-teletext");
    const Loaded l = load(kDir + "/damaged-subtitles-teletext.ts");
    // Every PMT copy fails its CRC: counted, and the service keeps no components.
    EXPECT_GE(l.stats.crcErrors,
              uint32_t(t["pmt_crc_problem"]["pmt_sections_with_bad_crc_in_capture"]));
    EXPECT_TRUE(l.stats.continuityErrors > 0 && l.stats.transportErrors > 0);
    const json& sdt = t["sdt"][0];
    const Service* s = l.services.at({sdt["onid"], sdt["tsid"], sdt["services"][0]["sid"]});
    EXPECT_EQ(s->name, unhex(sdt["services"][0]["name"]["hex"]));
    EXPECT_EQ(s->pmtPid, t["pat"]["programs"][0]["pid"]);
    EXPECT_TRUE(s->components.empty());
    EXPECT_NE(formatTsReadStats(l.stats).find(std::to_string(l.stats.crcErrors) + " bad CRC"),
              std::string::npos);
}

TEST(TsReader, SettingErrorsNameTheFileAndLine) {
    TempDir dir;
    const std::string notTs = dir.write("notes.ts", std::string("Good grief, this is text\n"));
    const std::string absent = dir / "absent.ts", x = dir / "x.ts", empty = dir / "empty";
    std::filesystem::create_directory(empty);
    std::vector<std::pair<std::string, std::string>> cases = {
            {notTs, notTs + ": not an MPEG transport stream"},
            {absent, absent + ": no such file or folder"},
            {empty, empty + ": folder holds no .ts capture"},
            {dir.write("x.broadcast", std::string("x.ts   # a capture\n")), x + ": cannot read"},
    };
    const std::pair<std::string, const char*> files[] = {
            {"# nothing\n\n", ": lists no capture"},
            {"# c\nx.ts satellite 11494000 22000000\n", ":2: satellite needs a symbol rate"},
            {"x.ts terrestrial 586000 8000\ny.ts cable\n", ":2: 'cable' needs a frequency"},
            {"x.ts dab 1\n", ":1: unknown delivery 'dab'"},
            {"x.ts terrestrial 0\n", ":1: bad frequency '0'"},
            {"x.ts terrestrial 586000 8500\n", ":1: bad bandwidth"},
            {"x.ts cable 306000 6900000 qam1024\n", ":1: bad modulation 'qam1024' (qam16..qam256)"},
            {"x.ts satellite 11494000 22000000 x\n", ":1: bad polarization"},
            {"x.ts satellite 11494000 22000000 h 19.2N\n", ":1: bad orbital position"},
            {"x.ts terrestrial 586000 8000 9\n", ":1: too many fields"},
    };
    for (const auto& [text, error] : files) {
        const std::string path = dir.write(std::to_string(cases.size()) + ".broadcast", text);
        cases.push_back({path, path + error});
    }
    for (const auto& [setting, want] : cases) {
        Broadcast b;
        std::string error;
        EXPECT_FALSE(loadBroadcast(setting, 0, b, error, nullptr)) << setting;
        EXPECT_EQ(error.substr(0, want.size()), want);
        EXPECT_TRUE(b.networks.empty());
    }
}

// "delivery kHz symbols/s bandwidth modulation polarization orbit tuned", in model codes.
TEST(TsReader, BroadcastLinesGiveTheirTuning) {
    const std::pair<const char*, const char*> cases[] = {
            {"a.ts terrestrial 586000", "2 586000 0 8000 7 0 0 1"},
            {"a.ts terrestrial 177500 7000 # VHF", "2 177500 0 7000 7 0 0 1"},
            {"a.ts cable 346000", "1 346000 6900000 0 6 0 0 1"},
            {"a.ts cable 346000 6875000 qam64", "1 346000 6875000 0 4 0 0 1"},
            {"a.ts satellite 11494000 22000000 v", "0 11494000 22000000 0 0 1 192 1"},
            {"a.ts satellite 12012000 27500000 L 30.5W", "0 12012000 27500000 0 0 2 -305 1"},
    };
    for (const auto& [text, want] : cases) {
        BroadcastLine line;
        std::string error;
        ASSERT_TRUE(parseBroadcastLine(text, line, error)) << text << ": " << error;
        const Tuning& t = line.tuning;
        std::ostringstream got;
        got << int(t.delivery) << ' ' << t.frequencyKHz << ' ' << t.symbolRate << ' '
            << t.bandwidthKHz << ' ' << int(t.modulation) << ' ' << int(t.polarization) << ' '
            << t.orbitalPosition << ' ' << line.tuned;
        EXPECT_EQ(got.str(), want) << text;
    }
}
