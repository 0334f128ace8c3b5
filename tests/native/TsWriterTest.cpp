#include <broadcast/Builtin.h>
#include <broadcast/DvbSubtitle.h>
#include <broadcast/DvbText.h>
#include <broadcast/TsWriter.h>
#include <gtest/gtest.h>
#include <receiver/Modules.h>
// clang-format off
#include <dvbpsi/dvbpsi.h>
#include <dvbpsi/descriptor.h>
#include <dvbpsi/demux.h>
#include <dvbpsi/eit.h>
#include <dvbpsi/nit.h>
#include <dvbpsi/dr_4d.h>
#include <dvbpsi/dr_83.h>
// clang-format on

#include <unistd.h>
#include <algorithm>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <nlohmann/json.hpp>
#include <set>
#include <string>
#include <tuple>

using namespace dvbmodel;
namespace fs = std::filesystem;

namespace {

constexpr int64_t kStart = 1709323200000;  // 2024-03-01T20:00:00Z

#define NEED_FFPROBE()                                                 \
    if (std::system("ffprobe -version >/dev/null 2>&1") != 0)          \
    GTEST_SKIP() << "ffprobe is not on PATH (Debian package ffmpeg): " \
                    "no independent reader of transport streams"

std::string run(const std::string& command) {
    std::string out;
    FILE* p = popen(command.c_str(), "r");
    char buf[4096];
    for (size_t n; p != nullptr && (n = fread(buf, 1, sizeof buf, p)) > 0;) out.append(buf, n);
    if (p != nullptr) pclose(p);
    return out;
}

struct TempDir {
    fs::path path = fs::temp_directory_path() / ("tswriter-" + std::to_string(getpid()));
    TempDir() { fs::create_directories(path); }
    ~TempDir() { fs::remove_all(path); }
    std::string operator/(const char* name) const { return (path / name).string(); }
};

void save(const std::string& path, const std::vector<uint8_t>& ts) {
    std::ofstream(path, std::ios::binary)
            .write(reinterpret_cast<const char*>(ts.data()), ts.size());
}

// One line per program (number, PMT and PCR PIDs, name) and per stream (PID, stream type, what
// its descriptors make of a private stream, languages), as ffprobe reads the file.
std::set<std::string> probe(const std::string& file) {
    auto j = nlohmann::json::parse(run("ffprobe -v error -show_programs -of json '" + file + "'"));
    std::set<std::string> out;
    for (const auto& p : j["programs"]) {
        if (p["program_num"] == 0) continue;  // services that only the SDT names
        out.insert("program " + p["program_num"].dump() + " pmt " + p["pmt_pid"].dump() + " pcr " +
                   p["pcr_pid"].dump() + " " + p.value("/tags/service_name"_json_pointer, ""));
        for (const auto& s : p["streams"]) {
            std::string tag = s.value("codec_tag", ""), codec = s.value("codec_name", "");
            out.insert(s.value("id", "") + " " + tag + (tag == "0x0006" ? " " + codec : "") + " " +
                       s.value("/tags/language"_json_pointer, ""));
        }
    }
    return out;
}

// The same lines from the model.
std::set<std::string> expected(const Transport& tp, const Service* only = nullptr) {
    std::set<std::string> out;
    char line[160];
    for (const auto& s : tp.services) {
        if (only != nullptr && &s != only) continue;
        snprintf(line, sizeof line, "program %u pmt %u pcr %u %s", s.id, s.pmtPid, s.pcrPid,
                 decodeText(s.name).c_str());
        out.insert(line);
        for (const auto& c : s.components) {
            const char* codec = c.kind == Kind::Subtitle   ? " dvb_subtitle"
                                : c.kind == Kind::Teletext ? " dvb_teletext"
                                : c.ac3                    ? " ac3"
                                : c.eac3                   ? " eac3"
                                                           : "";
            std::string languages = c.language;
            for (size_t i = 1; c.kind == Kind::Teletext && i < c.pages.size(); ++i)
                languages += "," + c.language;
            snprintf(line, sizeof line, "0x%x 0x%04x%s %s", c.pid, c.streamType,
                     c.streamType == 0x06 ? codec : "", languages.c_str());
            out.insert(line);
        }
    }
    return out;
}

TEST(TsWriter, EveryTransportOfTheBuiltinBroadcastReadsBackInFfprobe) {
    NEED_FFPROBE();
    TempDir dir;
    Broadcast b = builtinBroadcast(kStart / 1000);
    for (const auto& net : b.networks) {
        for (const auto& tp : net.transports) {
            std::vector<uint8_t> ts;
            TsWriterState state;
            writeTransport(b, net, tp, kStart, 1500, ts, state);
            save(dir / "tp.ts", ts);
            EXPECT_EQ(probe(dir / "tp.ts"), expected(tp)) << "transport " << tp.tsid;
            EXPECT_EQ(state.stats().sectionsDropped, 0u);
        }
    }
}

// The EIT and NIT of a written stream as libdvbpsi's decoders read them.
struct Tables {
    std::vector<dvbpsi_eit_t*> eit;
    std::vector<dvbpsi_nit_t*> nit;
    ~Tables() {
        for (auto* t : eit) dvbpsi_eit_delete(t);
        for (auto* t : nit) dvbpsi_nit_delete(t);
    }
    void read(const std::vector<uint8_t>& ts) {
        for (uint16_t pid : {0x10, 0x12}) {
            dvbpsi_t* h = dvbpsi_new(nullptr, DVBPSI_MSG_NONE);
            dvbpsi_AttachDemux(h, attach, this);
            for (size_t i = 0; i + 188 <= ts.size(); i += 188) {
                if (((ts[i + 1] & 0x1F) << 8 | ts[i + 2]) == pid)
                    dvbpsi_packet_push(h, const_cast<uint8_t*>(&ts[i]));
            }
            dvbpsi_DetachDemux(h);
            dvbpsi_delete(h);
        }
    }
    template <typename T>
    static void keep(void* list, T* table) {
        static_cast<std::vector<T*>*>(list)->push_back(table);
    }
    static void attach(dvbpsi_t* h, uint8_t table, uint16_t ext, void* self) {
        auto* t = static_cast<Tables*>(self);
        if (table == 0x4E || table == 0x50 || table == 0x51)
            dvbpsi_eit_attach(h, table, ext, keep<dvbpsi_eit_t>, &t->eit);
        if (table == 0x40) dvbpsi_nit_attach(h, table, ext, keep<dvbpsi_nit_t>, &t->nit);
    }
};

// EN 300 468 annex C read back: modified Julian date and BCD hours, minutes, seconds.
int64_t utcSeconds(uint64_t t) {
    auto bcd = [](uint64_t v) { return int64_t(v >> 4 & 15) * 10 + int64_t(v & 15); };
    return (int64_t(t >> 24) - 40587) * 86400 + bcd(t >> 16) * 3600 + bcd(t >> 8) * 60 + bcd(t);
}

TEST(TsWriter, EventsAndLogicalChannelsReadBackInLibdvbpsi) {
    Broadcast b = builtinBroadcast(kStart / 1000);
    const Network& net = b.networks[0];
    const Transport& tp = net.transports[0];
    // The first service's present event ends 5 s into the span: its p/f then takes version 1.
    const Event* ending = dvbrx::Receiver::eventAt(tp.services[0], kStart / 1000 + 7 * 3600);
    int64_t from = (ending->start + ending->duration) * 1000 - 5000;
    std::vector<uint8_t> ts;
    TsWriterState state;
    writeTransport(b, net, tp, from, 20000, ts, state);  // the schedule twice
    Tables tables;
    tables.read(ts);
    for (const auto& s : tp.services) {
        auto eit = std::find_if(tables.eit.begin(), tables.eit.end(), [&](auto* e) {
            return e->i_extension == s.id && e->i_table_id == 0x4E;
        });
        // The schedule: every event from the UTC midnight on, in tables 0x50 and 0x51.
        std::set<int> schedule, model;
        for (const auto* e : tables.eit)
            for (auto* ev = e->p_first_event; ev && e->i_extension == s.id; ev = ev->p_next)
                if (e->i_table_id != 0x4E) schedule.insert(ev->i_event_id);
        for (const auto& e : s.events)
            if (e.start >= from / 86400000 * 86400) model.insert(e.id);
        EXPECT_EQ(schedule, model) << s.id;
        ASSERT_NE(eit, tables.eit.end()) << s.id;
        const Event* want[2] = {dvbrx::Receiver::eventAt(s, from / 1000),
                                dvbrx::Receiver::eventAfter(s, from / 1000)};
        const dvbpsi_eit_event_t* got = (*eit)->p_first_event;
        for (int i = 0; i < 2; ++i, got = got->p_next) {
            ASSERT_TRUE(got != nullptr && want[i] != nullptr) << s.id;
            EXPECT_EQ(got->i_event_id, want[i]->id);
            EXPECT_EQ(utcSeconds(got->i_start_time), want[i]->start);
            EXPECT_EQ(utcSeconds(uint64_t{40587} << 24 | got->i_duration), want[i]->duration);
            EXPECT_EQ(got->i_running_status, i == 0 ? 4 : 1);
            auto* d = dvbpsi_DecodeShortEventDr(got->p_first_descriptor);
            ASSERT_NE(d, nullptr);
            EXPECT_EQ(std::string(d->i_event_name, d->i_event_name + d->i_event_name_length),
                      want[i]->name);
        }
    }
    auto last = std::find_if(tables.eit.rbegin(), tables.eit.rend(), [&](auto* e) {
        return e->i_extension == tp.services[0].id && e->i_table_id == 0x4E;
    });
    EXPECT_EQ((*last)->i_version, 1);
    EXPECT_EQ((*last)->p_first_event->i_event_id, ending[1].id);
    ASSERT_FALSE(tables.nit.empty());
    std::set<std::array<int, 3>> lcns, model;
    for (const auto* ts = tables.nit[0]->p_first_ts; ts != nullptr; ts = ts->p_next) {
        for (auto* d = ts->p_first_descriptor; d != nullptr; d = d->p_next) {
            auto* lcn = d->i_tag == 0x83 ? dvbpsi_DecodeLCNDr(d) : nullptr;
            for (int i = 0; lcn != nullptr && i < lcn->i_number_of_entries; ++i)
                lcns.insert({ts->i_ts_id, lcn->p_entries[i].i_service_id,
                             lcn->p_entries[i].i_logical_channel_number});
        }
    }
    for (const auto& t : net.transports)
        for (const auto& s : t.services)
            if (s.lcn != 0) model.insert({t.tsid, s.id, s.lcn});
    EXPECT_EQ(lcns, model);
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

// What a display set shows: each placement with its region's pixels.
std::vector<std::tuple<int, int, int, std::vector<uint8_t>>> shown(const DisplaySet& s) {
    std::vector<std::tuple<int, int, int, std::vector<uint8_t>>> out;
    for (const auto& at : s.placements)
        for (const auto& r : s.regions)
            if (r.id == at.id) out.emplace_back(at.id, at.x, at.y, r.pixels);
    return out;
}

TEST(TsWriter, SubtitlesDecodeToTheModelsDisplaySetsInOursAndInFfmpeg) {
    Broadcast b = builtinBroadcast(kStart / 1000);
    const Network& net = b.networks[0];
    const Transport& tp = net.transports[0];
    const Service& svc = tp.services[0];
    const Component* sub = nullptr;
    for (const auto& c : svc.components) sub = c.kind == Kind::Subtitle ? &c : sub;
    ASSERT_NE(sub, nullptr);
    if (svc.subtitles.size() < 4) GTEST_SKIP() << "no display sets: the built-in font is absent";
    // The loop's first four display sets.
    std::vector<uint8_t> ts;
    TsWriterState state;
    writeTransport(b, net, tp, kStart, svc.subtitles[3].time + 1, ts, state);
    std::vector<std::vector<uint8_t>> pes;
    PesAssembler(sub->pid).feed(ts.data(), ts.size(), pes);
    DvbSubtitleDecoder decoder(sub->compositionPageId, sub->ancillaryPageId);
    std::vector<DisplaySet> sets;
    for (const auto& p : pes) decoder.feed(p.data(), p.size(), sets);
    ASSERT_GE(sets.size(), 3u);  // the fourth is emitted by the next page composition
    for (size_t i = 0; i < sets.size(); ++i) {
        const DisplaySet& want = svc.subtitles[i];
        EXPECT_EQ(sets[i].pts, tsClockAt(kStart + want.time + kTsDecodeDelayMs)) << i;
        EXPECT_TRUE(shown(sets[i]) == shown(want)) << i;
    }
    NEED_FFPROBE();
    TempDir dir;
    save(dir / "all.ts", ts);
    char pid[16];
    snprintf(pid, sizeof pid, "0x%x", sub->pid);
    std::string copy = "ffmpeg -nostdin -v error -y -i '" + dir / "all.ts" + "' -map 0:i:" + pid +
                       " -c copy -f mpegts '" + dir / "sub.ts" + "'";
    ASSERT_EQ(std::system(copy.c_str()), 0) << copy;
    // ffmpeg decodes one subtitle frame per display set.
    std::string count =
            "ffprobe -v error -count_frames -show_entries stream=nb_read_frames -of csv=p=0 ";
    EXPECT_EQ(std::stoi(run(count + "'" + dir / "sub.ts" + "'")), 4);
}

// A receiver of the built-in broadcast on a fixed clock plays a service of a cable multiplex,
// records it and dumps the multiplex.
TEST(TsRecording, TimeShiftRecordsTheServiceAndADumpTheTransponder) {
    TempDir dir;
    auto rx = std::make_shared<dvbrx::Receiver>(builtinBroadcast(kStart / 1000),
                                                dvbrx::Clock::Settings{true, kStart, 0.0, 7},
                                                [](int, int, int) {});
    android::sp<dvbrx::ReceiverStrm> strm = new dvbrx::ReceiverStrm(rx);
    android::sp<dvbrx::ReceiverCfg> cfg = new dvbrx::ReceiverCfg(rx);
    const Transport* tp = nullptr;
    for (const auto& net : rx->broadcast().networks) {
        for (const auto& t : net.transports) tp = t.tuning.delivery == Delivery::Cable ? &t : tp;
    }
    const Service& svc = tp->services[0];
    STRM_OpenSettings open{};
    int32_t h = strm->Open(&open);
    STRM_Settings s{};
    s.fe.type = dvbrx::kCable;
    s.fe.frequency = static_cast<int32_t>(tp->tuning.frequencyKHz);
    s.fe.symbolRate = static_cast<int32_t>(tp->tuning.symbolRate);
    s.fe.modulation = static_cast<int32_t>(tp->tuning.modulation);
    s.fe.fecInner = 10;
    s.svcId = svc.id;
    ASSERT_EQ(strm->Start(h, &s), dvbrx::kOk);
    EXPECT_EQ(cfg->TSDumpStart(0, 0, 0, (dir / "missing/dump.ts").c_str()), dvbrx::kErrPath);
    ASSERT_EQ(cfg->TSDumpStart(0, 0, 0, (dir / "dump.ts").c_str()), dvbrx::kOk);
    EXPECT_EQ(cfg->TSDumpStart(0, 0, 0, (dir / "other.ts").c_str()), dvbrx::kErrBusy);
    auto advance = [&rx](int64_t ms) { rx->clock().advance(ms), rx->sync(); };
    advance(1000);
    s.playSpeedDiv = 1;  // paused at 0: recording
    rx->recordDir = dir / "missing";
    EXPECT_EQ(strm->SetSettings(h, &s), dvbrx::kErrPath);
    rx->recordDir = dir.path.string();
    ASSERT_EQ(strm->SetSettings(h, &s), dvbrx::kOk);
    advance(2500);
    STRM_GetStatus st{};
    strm->GetStatus(h, &st);
    std::string file = (dir.path / "rec-").string() + std::to_string(tp->onid) + "-" +
                       std::to_string(tp->tsid) + "-" + std::to_string(svc.id) + "-" +
                       std::to_string(kStart / 1000 + 1) + ".ts";
    EXPECT_EQ(st.recduration, 2);
    EXPECT_EQ(st.recsize, static_cast<int64_t>(fs::file_size(file)));
    advance(500);
    ASSERT_EQ(strm->Stop(h, 0), dvbrx::kOk);
    ASSERT_EQ(cfg->TSDumpStop(), dvbrx::kOk);
    EXPECT_GT(static_cast<int64_t>(fs::file_size(file)), st.recsize);  // up to the stop

    // The recording plays back through a stream opened on its path, its own service only.
    STRM_OpenSettings back{};
    snprintf(back.szPath, sizeof back.szPath, "%s", (dir / "missing.ts").c_str());
    EXPECT_EQ(strm->Open(&back), dvbrx::kErrPath);
    ASSERT_LT(file.size(), sizeof back.szPath);
    snprintf(back.szPath, sizeof back.szPath, "%s", file.c_str());
    int32_t p = strm->Open(&back);
    STRM_Settings play{};
    play.svcId = tp->services[1].id;
    EXPECT_EQ(strm->Start(p, &play), dvbrx::kErrNoService);
    play.svcId = svc.id;
    ASSERT_EQ(strm->Start(p, &play), dvbrx::kOk);
    advance(1500);
    STRM_GetStatus pb{};
    strm->GetStatus(p, &pb);
    STRM_StreamInfo info{};
    ASSERT_EQ(strm->CreatStreamInfo(p, &info), dvbrx::kOk);
    auto count = [&svc](Kind k) {
        return std::count_if(svc.components.begin(), svc.components.end(),
                             [k](const Component& c) { return c.kind == k; });
    };
    EXPECT_EQ(std::make_tuple(pb.pbstate, pb.pbposition, info.videoCount, info.audioCount,
                              info.subtitleCount),
              std::make_tuple(int32_t{dvbrx::kPvrActive}, 1, count(Kind::Video), count(Kind::Audio),
                              count(Kind::Subtitle)));
    EXPECT_EQ(strm->SetSettings(p, &s), dvbrx::kErrNotSupported);  // not recorded again
    NEED_FFPROBE();
    EXPECT_EQ(probe(file), expected(*tp, &svc));
    EXPECT_EQ(probe(dir / "dump.ts"), expected(*tp));
}

}  // namespace
