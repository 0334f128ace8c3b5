#include <broadcast/Builtin.h>
#include <broadcast/DvbSubtitle.h>
#include <broadcast/DvbText.h>
#include <broadcast/TsWriter.h>
#include <gtest/gtest.h>
#include <receiver/Modules.h>

#include <unistd.h>
#include <algorithm>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <nlohmann/json.hpp>
#include <set>
#include <string>

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
        ASSERT_EQ(sets[i].placements.size(), want.placements.size()) << i;
        for (size_t r = 0; r < want.placements.size(); ++r) {
            EXPECT_EQ(sets[i].placements[r].x, want.placements[r].x) << i;
            EXPECT_EQ(sets[i].placements[r].y, want.placements[r].y) << i;
        }
        // The placed regions' pixels (the decoder keeps the epoch's others too).
        for (const auto& at : want.placements) {
            auto same = [&at](const Region& r) { return r.id == at.id; };
            auto got = std::find_if(sets[i].regions.begin(), sets[i].regions.end(), same);
            auto was = std::find_if(want.regions.begin(), want.regions.end(), same);
            ASSERT_TRUE(got != sets[i].regions.end() && was != want.regions.end()) << i;
            EXPECT_TRUE(got->pixels == was->pixels) << i << " region " << int(at.id);
        }
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
    std::string frames =
            run("ffprobe -v error -count_frames -show_entries stream=nb_read_frames "
                "-of csv=p=0 '" +
                dir / "sub.ts" + "'");
    EXPECT_EQ(std::stoi(frames), 4);
}

// A receiver of the built-in broadcast on a fixed clock, tuned to a cable multiplex.
class TsRecordingTest : public ::testing::Test {
protected:
    TsRecordingTest()
        : rx(std::make_shared<dvbrx::Receiver>(builtinBroadcast(kStart / 1000),
                                               dvbrx::Clock::Settings{true, kStart, 0.0, 7},
                                               [](int, int, int) {})),
          strm(new dvbrx::ReceiverStrm(rx)),
          cfg(new dvbrx::ReceiverCfg(rx)) {
        for (const auto& net : rx->broadcast().networks) {
            for (const auto& t : net.transports)
                tp = t.tuning.delivery == Delivery::Cable ? &t : tp;
        }
        fe.type = dvbrx::kCable;
        fe.frequency = static_cast<int32_t>(tp->tuning.frequencyKHz);
        fe.symbolRate = static_cast<int32_t>(tp->tuning.symbolRate);
        fe.modulation = static_cast<int32_t>(tp->tuning.modulation);
        fe.fecInner = 10;
        rx->recordDir = dir.path.string();
    }
    void advance(int64_t ms) {
        rx->clock().advance(ms);
        rx->sync();
    }

    TempDir dir;
    std::shared_ptr<dvbrx::Receiver> rx;
    android::sp<dvbrx::ReceiverStrm> strm;
    android::sp<dvbrx::ReceiverCfg> cfg;
    const Transport* tp = nullptr;
    ANT_FrontendParameters fe{};
};

TEST_F(TsRecordingTest, TimeShiftRecordsTheServiceAsOneProgram) {
    const Service& svc = tp->services[0];
    STRM_OpenSettings open{};
    int32_t h = strm->Open(&open);
    STRM_Settings s{};
    s.fe = fe;
    s.svcId = svc.id;
    ASSERT_EQ(strm->Start(h, &s), dvbrx::kOk);
    advance(1000);
    s.playSpeedDiv = 1;  // paused at 0: recording
    rx->recordDir = dir / "missing";
    EXPECT_EQ(strm->SetSettings(h, &s), dvbrx::kErrPath);
    rx->recordDir = dir.path.string();
    ASSERT_EQ(strm->SetSettings(h, &s), dvbrx::kOk);
    advance(2500);
    STRM_GetStatus st{};
    strm->GetStatus(h, &st);
    std::string file =
            dir.path / ("rec-" + std::to_string(tp->onid) + "-" + std::to_string(tp->tsid) + "-" +
                        std::to_string(svc.id) + "-" + std::to_string(kStart / 1000 + 1) + ".ts");
    EXPECT_EQ(st.recduration, 2);
    EXPECT_EQ(st.recsize, static_cast<int64_t>(fs::file_size(file)));
    advance(500);
    ASSERT_EQ(strm->Stop(h, 0), dvbrx::kOk);
    EXPECT_GT(static_cast<int64_t>(fs::file_size(file)), st.recsize);  // up to the stop
    NEED_FFPROBE();
    EXPECT_EQ(probe(file), expected(*tp, &svc));
}

TEST_F(TsRecordingTest, DumpWritesTheTunedTransponder) {
    ASSERT_EQ(cfg->Tune(0, &fe), dvbrx::kOk);
    EXPECT_EQ(cfg->TSDumpStart(0, 0, 0, (dir / "missing/dump.ts").c_str()), dvbrx::kErrPath);
    ASSERT_EQ(cfg->TSDumpStart(0, 0, 0, (dir / "dump.ts").c_str()), dvbrx::kOk);
    EXPECT_EQ(cfg->TSDumpStart(0, 0, 0, (dir / "other.ts").c_str()), dvbrx::kErrBusy);
    advance(3000);
    ASSERT_EQ(cfg->TSDumpStop(), dvbrx::kOk);
    // Nothing before the lock (250 ms for cable), every packet after it, the file closed.
    EXPECT_EQ(fs::file_size(dir / "dump.ts") % 188, 0u);
    NEED_FFPROBE();
    EXPECT_EQ(probe(dir / "dump.ts"), expected(*tp));
}

}  // namespace
