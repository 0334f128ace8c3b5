// The DVB subtitle decoder on PES packets of one subtitle PID: the input is a series of PES
// packets, each preceded by its length (two bytes, big-endian). Every display set it emits is
// encoded again and decoded by a second decoder, which must give it back unchanged in pixels.
#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <vector>

#include "Harness.h"
#include "broadcast/DvbSubtitle.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    using namespace dvbmodel;
    DvbSubtitleDecoder decoder(3, 4);
    std::vector<DisplaySet> sets;
    while (size >= 2) {
        size_t n = std::min<size_t>(size - 2, size_t{data[0]} << 8 | data[1]);
        // Each packet in a buffer of its own size, so that ASan sees any read past it.
        std::vector<uint8_t> pes(data + 2, data + 2 + n);
        decoder.feed(pes.data(), pes.size(), sets);
        data += 2 + n, size -= 2 + n;
    }
    for (const DisplaySet& set : sets) {
        for (const Region& r : set.regions)
            FUZZ_CHECK(r.pixels.size() == size_t{r.width} * r.height);
        std::vector<uint8_t> pes = encodeDisplaySet(set, 3, set.pts);
        DvbSubtitleDecoder again(3, 4);
        std::vector<DisplaySet> back;
        again.feed(pes.data(), pes.size(), back);
        FUZZ_CHECK(pes.empty() || back.size() == 1);
        for (size_t i = 0; !pes.empty() && i < set.regions.size(); ++i) {
            FUZZ_CHECK(back[0].regions.size() == set.regions.size());
            FUZZ_CHECK(back[0].regions[i].pixels == set.regions[i].pixels);
        }
    }
    return 0;
}
