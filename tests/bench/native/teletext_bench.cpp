// Teletext pages decoded per second from teletext-arte.ts held in memory, as a ratio to the
// rate at which the broadcast itself sends them (its pages over the span of its PES time
// stamps) in wall time; target: at least 100 times, one core keeping up with 100 teletext streams.
//  - BM_TeletextFromPes: the decoder alone over the PES packets of the teletext PID;
//  - BM_TeletextFromTs: the transport stream's packets reassembled into PES, then decoded.
// The capture comes from ../shared/testdata beside the project; without it nothing runs.
#include <broadcast/DvbTeletext.h>
#include <broadcast/Ts.h>

#include <benchmark/benchmark.h>

#include <chrono>
#include <cstdio>
#include <fstream>
#include <iterator>
#include <vector>

namespace {

using namespace dvbmodel;

constexpr uint16_t kPid = 0x042C;

struct Capture {
    std::vector<uint8_t> ts;
    std::vector<std::vector<uint8_t>> pes;
    size_t pages = 0;
    double seconds = 0;  // from the first PES time stamp to the last
};

uint64_t pts(const std::vector<uint8_t>& p) {
    if (p.size() < 14 || !(p[7] & 0x80)) return 0;
    return readPts(p.data() + 9);
}

const Capture& capture() {
    static const Capture c = [] {
        Capture c;
        std::ifstream in(DVB_TESTDATA_DIR "/teletext-arte.ts", std::ios::binary);
        c.ts.assign(std::istreambuf_iterator<char>(in), {});
        PesAssembler(kPid).feed(c.ts.data(), c.ts.size(), c.pes);
        if (c.pes.size() < 2) return c;
        TeletextDecoder decoder;
        std::vector<TeletextPage> pages;
        for (const auto& p : c.pes) decoder.feed(p.data(), p.size(), 0, pages);
        c.pages = pages.size();
        c.seconds = double(pts(c.pes.back()) - pts(c.pes.front())) / 90000;
        return c;
    }();
    return c;
}

// Pages per second of CPU time, and over the broadcast's own pages per second.
void report(benchmark::State& state, size_t pages, std::chrono::steady_clock::time_point t0) {
    const Capture& c = capture();
    const double wall =
            std::chrono::duration<double>(std::chrono::steady_clock::now() - t0).count();
    state.counters["pages/s"] = benchmark::Counter(double(pages), benchmark::Counter::kIsRate);
    state.counters["x_broadcast"] = pages / wall / (c.pages / c.seconds);
}

void BM_TeletextFromPes(benchmark::State& state) {
    const Capture& c = capture();
    if (!c.pages) return state.SkipWithError("teletext-arte.ts absent or without pages");
    size_t pages = 0;
    std::vector<TeletextPage> out;
    const auto t0 = std::chrono::steady_clock::now();
    for (auto _ : state) {
        TeletextDecoder decoder;
        out.clear();
        for (const auto& p : c.pes) decoder.feed(p.data(), p.size(), 0, out);
        pages += out.size();
    }
    report(state, pages, t0);
}

void BM_TeletextFromTs(benchmark::State& state) {
    const Capture& c = capture();
    if (!c.pages) return state.SkipWithError("teletext-arte.ts absent or without pages");
    size_t pages = 0;
    std::vector<std::vector<uint8_t>> pes;
    std::vector<TeletextPage> out;
    const auto t0 = std::chrono::steady_clock::now();
    for (auto _ : state) {
        PesAssembler assembler(kPid);
        TeletextDecoder decoder;
        pes.clear();
        out.clear();
        assembler.feed(c.ts.data(), c.ts.size(), pes);
        for (const auto& p : pes) decoder.feed(p.data(), p.size(), 0, out);
        pages += out.size();
    }
    report(state, pages, t0);
}

}  // namespace

BENCHMARK(BM_TeletextFromPes)->Repetitions(3)->ReportAggregatesOnly(true);
BENCHMARK(BM_TeletextFromTs)->Repetitions(3)->ReportAggregatesOnly(true);

int main(int argc, char** argv) {
    benchmark::Initialize(&argc, argv);
    const Capture& c = capture();
    std::printf(
            "teletext-arte.ts: %zu PES packets, %zu pages in %.1f s of broadcast (%.1f pages/s)\n",
            c.pes.size(), c.pages, c.seconds, c.seconds > 0 ? c.pages / c.seconds : 0.0);
    benchmark::RunSpecifiedBenchmarks();
}
