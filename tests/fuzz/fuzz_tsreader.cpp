// The transport-stream reader on any bytes: mostly slices of real captures, mutated. Whatever
// it reads must hold together: no packet counted that the input does not hold, every region's
// pixels its width times its height, every display set inside the capture's loop, and a
// rejected input gives an error and no broadcast.
#include "Harness.h"
#include "broadcast/TsReader.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    using namespace dvbmodel;
    // A buffer of the input's own size, so that ASan sees any read past it.
    std::vector<uint8_t> ts(data, data + size);
    TsCapture capture;
    TsReadStats stats;
    std::string error;
    const bool ok = readTransportStream(ts.data(), ts.size(), "input", capture, error, stats);
    FUZZ_CHECK(ok == error.empty());
    FUZZ_CHECK(ok || (capture.networks.empty() && stats.packets == 0));
    FUZZ_CHECK(stats.packets <= size / 188);
    FUZZ_CHECK(capture.tuned.size() == capture.networks.size());
    for (size_t n = 0; n < capture.networks.size(); ++n) {
        FUZZ_CHECK(capture.tuned[n].size() == capture.networks[n].transports.size());
        for (const Transport& t : capture.networks[n].transports)
            for (const Service& s : t.services) {
                for (const DisplaySet& set : s.subtitles) {
                    FUZZ_CHECK(set.time >= 0 && set.time < capture.durationMs);
                    for (const Region& r : set.regions)
                        FUZZ_CHECK(r.pixels.size() == size_t{r.width} * r.height);
                }
                for (size_t e = 1; e < s.events.size(); ++e)
                    FUZZ_CHECK(s.events[e - 1].start <= s.events[e].start);
            }
    }
    return 0;
}
