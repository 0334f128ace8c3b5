// Reading transport streams held in memory: the French multiplex's capture repeated to 1 GB.
//  - BM_BareWalk: sync byte and PID of every packet, nothing else: the floor;
//  - BM_UnaskedPids: the reader over the same packets with every PID moved to one that no
//    table names (target: at most 1.2 times the bare walk);
//  - BM_SiOnly: the reader building the broadcast model from the SI;
//  - BM_SiAndEpg: the same, then every service's schedule stored in an event database as the
//    receiver stores it (target: at least 100 times the capture's own broadcast rate).
//  - BM_SubtitleDecode: the display sets of dvbsub-canalplus-cinema.ts (PID 0x0157) decoded
//    from its PES packets, display sets per second and x_broadcast, that rate over the
//    capture's own display sets per second (target: at least 50 streams on one core);
//  - BM_SubtitleVsFfmpeg: the same display set repeated 1000 times (3 s apart) in a stream that
//    ffmpeg also decodes (with -benchmark: its user CPU time), x_ffmpeg = ffmpeg's CPU time over
//    ours for the same display sets. ffmpeg renders each onto a whole 720x576 frame
//    (sub2video), the decoder only its regions: the ratio flatters us by that much.
// Counters: MB/s, x_bare (time over the bare walk's in the same run) and x_broadcast (bytes per
// second over the capture's bytes per second of broadcast). The capture comes from
// ../shared/testdata beside the project; without it nothing runs.
#include <broadcast/DvbSubtitle.h>
#include <broadcast/Ts.h>
#include <broadcast/TsReader.h>
#include <receiver/Receiver.h>

#include <benchmark/benchmark.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <vector>

namespace {

using namespace dvbmodel;
using Clock = std::chrono::steady_clock;

constexpr size_t kBytes = size_t{1} << 30;

struct Stream {
    std::vector<uint8_t> ts, unasked;
    double broadcastRate = 0;  // the capture's bytes per second of broadcast
    double bareSeconds = 0;    // one bare walk, measured first
};

uint64_t bareWalk(const std::vector<uint8_t>& ts) {
    uint64_t sum = 0;
    for (size_t i = 0; i + 188 <= ts.size(); i += 188) {
        if (ts[i] == 0x47) sum += (ts[i + 1] & 0x1F) << 8 | ts[i + 2];
    }
    return sum;
}

const Stream& stream() {
    static const Stream s = [] {
        Stream s;
        std::ifstream in(DVB_TESTDATA_DIR "/fr-dvbt-multiplex-si.ts", std::ios::binary);
        std::vector<uint8_t> one(std::istreambuf_iterator<char>(in), {});
        if (one.empty()) return s;
        TsCapture c;
        TsReadStats stats;
        std::string error;
        readTransportStream(one.data(), one.size(), "capture", c, error, stats);
        s.broadcastRate = one.size() / (c.durationMs / 1000.0);
        while (s.ts.size() + one.size() <= kBytes) s.ts.insert(s.ts.end(), one.begin(), one.end());
        s.unasked = s.ts;
        for (size_t i = 0; i + 188 <= s.unasked.size(); i += 188) {
            s.unasked[i + 1] = (s.unasked[i + 1] & 0xE0) | 0x10;  // PID 0x1000..0x10FF
        }
        // The floor: the fastest of a few walks, the first one warming the pages.
        s.bareSeconds = 1e9;
        for (int i = 0; i < 4; ++i) {
            auto t0 = Clock::now();
            benchmark::DoNotOptimize(bareWalk(s.ts));
            s.bareSeconds = std::min(s.bareSeconds,
                                     std::chrono::duration<double>(Clock::now() - t0).count());
        }
        return s;
    }();
    return s;
}

void report(benchmark::State& state, const std::vector<uint8_t>& ts, Clock::time_point t0) {
    const Stream& s = stream();
    double seconds = std::chrono::duration<double>(Clock::now() - t0).count() / state.iterations();
    state.counters["MB/s"] = ts.size() / seconds / 1e6;
    state.counters["x_bare"] = seconds / s.bareSeconds;
    state.counters["x_broadcast"] = ts.size() / seconds / s.broadcastRate;
}

bool have(benchmark::State& state) {
    if (!stream().ts.empty()) return true;
    state.SkipWithError("no capture at " DVB_TESTDATA_DIR);
    return false;
}

void BM_BareWalk(benchmark::State& state) {
    if (!have(state)) return;
    auto t0 = Clock::now();
    for (auto _ : state) benchmark::DoNotOptimize(bareWalk(stream().ts));
    report(state, stream().ts, t0);
}

// Reads `ts`, then stores the schedules when `epg` is given.
void read(benchmark::State& state, const std::vector<uint8_t>& ts, bool epg) {
    if (!have(state)) return;
    std::string path = std::filesystem::temp_directory_path() / "tsreader-bench.db";
    auto t0 = Clock::now();
    for (auto _ : state) {
        TsCapture c;
        TsReadStats stats;
        std::string error;
        readTransportStream(ts.data(), ts.size(), "bench", c, error, stats);
        if (!epg) continue;
        for (const char* end : {"", "-wal", "-shm"}) std::filesystem::remove(path + end);
        auto db = dvbrx::EpgDatabase::open(path, &error);
        int64_t today = c.firstUtc / 86400 * 86400;
        for (const Network& n : c.networks)
            for (const Transport& t : n.transports)
                for (const Service& svc : t.services)
                    dvbrx::storeSchedule(*db, {t.onid, t.tsid, svc.id}, svc, today);
    }
    report(state, ts, t0);
}

void BM_UnaskedPids(benchmark::State& state) {
    read(state, stream().unasked, false);
}
void BM_SiOnly(benchmark::State& state) {
    read(state, stream().ts, false);
}
void BM_SiAndEpg(benchmark::State& state) {
    read(state, stream().ts, true);
}

void BM_SubtitleDecode(benchmark::State& state) {
    std::ifstream in(DVB_TESTDATA_DIR "/dvbsub-canalplus-cinema.ts", std::ios::binary);
    std::vector<uint8_t> ts(std::istreambuf_iterator<char>(in), {});
    std::vector<std::vector<uint8_t>> pes;
    PesAssembler(0x0157).feed(ts.data(), ts.size(), pes);
    TsCapture c;
    TsReadStats stats;
    std::string error;
    if (pes.empty() || !readTransportStream(ts.data(), ts.size(), "capture", c, error, stats)) {
        state.SkipWithError("no capture at " DVB_TESTDATA_DIR);
        return;
    }
    size_t sets = 0;
    auto t0 = Clock::now();
    for (auto _ : state) {
        DvbSubtitleDecoder decoder(3, 4);
        std::vector<DisplaySet> out;
        for (const auto& p : pes) decoder.feed(p.data(), p.size(), out);
        sets += out.size();
    }
    double seconds = std::chrono::duration<double>(Clock::now() - t0).count();
    state.counters["sets/s"] = sets / seconds;
    state.counters["x_broadcast"] =
            sets / seconds / (double(sets) / state.iterations() / (c.durationMs / 1000.0));
}

void BM_SubtitleVsFfmpeg(benchmark::State& state) {
    constexpr int kRepeats = 1000;
    std::ifstream in(DVB_TESTDATA_DIR "/dvbsub-canalplus-cinema.ts", std::ios::binary);
    std::vector<uint8_t> capture(std::istreambuf_iterator<char>(in), {});
    std::vector<std::vector<uint8_t>> pes;
    PesAssembler(0x0157).feed(capture.data(), capture.size(), pes);
    if (pes.empty() || std::system("ffmpeg -version >/dev/null 2>&1") != 0) {
        state.SkipWithError("needs the capture and ffmpeg");
        return;
    }
    // The capture's PAT and PMT first, then the display set's PES packets again and again.
    std::vector<uint8_t> ts;
    for (size_t i = 0; i + 188 <= capture.size(); i += 188) {
        uint16_t pid = (capture[i + 1] & 0x1F) << 8 | capture[i + 2];
        if (pid == 0 || (capture[i + 5] == 0x02 && (capture[i + 1] & 0x40)))
            ts.insert(ts.end(), capture.begin() + i, capture.begin() + i + 188);
    }
    std::vector<std::vector<uint8_t>> repeated;
    uint8_t cc = 0;
    for (int k = 0; k < kRepeats; ++k) {
        for (auto p : pes) {
            if (p.size() < 14 || !(p[7] & 0x80)) continue;
            writePts(p.data() + 9,
                     (readPts(p.data() + 9) + uint64_t(k) * 270000) & ((uint64_t{1} << 33) - 1));
            packetizePes(0x0157, p, cc, ts);
            repeated.push_back(std::move(p));
        }
    }
    std::string path = std::filesystem::temp_directory_path() / "subtitle-bench.ts";
    std::ofstream(path, std::ios::binary)
            .write(reinterpret_cast<const char*>(ts.data()), ts.size());
    double ours = 0, theirs = 0;
    size_t sets = 0;
    for (auto _ : state) {
        auto t0 = Clock::now();
        DvbSubtitleDecoder decoder(3, 4);
        std::vector<DisplaySet> out;
        for (const auto& p : repeated) decoder.feed(p.data(), p.size(), out);
        ours += std::chrono::duration<double>(Clock::now() - t0).count();
        sets += out.size();
        std::string command = "ffmpeg -nostdin -benchmark -i " + path +
                              " -filter_complex '[0:i:0x157]null[s]' -map '[s]' -f null - 2>&1";
        FILE* f = popen(command.c_str(), "r");
        char line[512];
        while (f != nullptr && fgets(line, sizeof line, f) != nullptr) {
            double utime = 0;
            if (sscanf(line, "bench: utime=%lfs", &utime) == 1) theirs += utime;
        }
        if (f != nullptr) pclose(f);
    }
    state.counters["sets"] = double(sets) / state.iterations();
    state.counters["ours_s"] = ours / state.iterations();
    state.counters["ffmpeg_s"] = theirs / state.iterations();
    state.counters["x_ffmpeg"] = ours > 0 ? theirs / ours : 0;
    std::filesystem::remove(path);
}

BENCHMARK(BM_SubtitleVsFfmpeg)->Unit(benchmark::kMillisecond)->Iterations(1);
BENCHMARK(BM_SubtitleDecode)->Unit(benchmark::kMicrosecond);
BENCHMARK(BM_BareWalk)->Unit(benchmark::kMillisecond)->Iterations(3);
BENCHMARK(BM_UnaskedPids)->Unit(benchmark::kMillisecond)->Iterations(3);
BENCHMARK(BM_SiOnly)->Unit(benchmark::kMillisecond)->Iterations(1);
BENCHMARK(BM_SiAndEpg)->Unit(benchmark::kMillisecond)->Iterations(1);

}  // namespace

BENCHMARK_MAIN();
