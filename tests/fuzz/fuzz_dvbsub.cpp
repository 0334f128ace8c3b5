// The DVB subtitle decoder on PES packets of one subtitle PID: the input is a series of PES
// packets, each preceded by its length (two bytes, big-endian) and held in a buffer of its own
// size, so that AddressSanitizer sees any read past it. Every display set it emits must come
// back unchanged in pixels through the encoder and a second decoder.
#include "Harness.h"
#include "broadcast/DvbSubtitle.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    using namespace dvbmodel;
    DvbSubtitleDecoder decoder(3, 4);
    std::vector<DisplaySet> sets;
    for (size_t n; size >= 2; data += 2 + n, size -= 2 + n) {
        n = std::min<size_t>(size - 2, size_t{data[0]} << 8 | data[1]);
        std::vector<uint8_t> pes(data + 2, data + 2 + n);
        decoder.feed(pes.data(), pes.size(), sets);
    }
    for (const DisplaySet& set : sets) {
        for (const Region& r : set.regions)
            FUZZ_CHECK(r.pixels.size() == size_t{r.width} * r.height);
        std::vector<uint8_t> pes = encodeDisplaySet(set, 3, set.pts);
        std::vector<DisplaySet> back;
        DvbSubtitleDecoder(3, 4).feed(pes.data(), pes.size(), back);
        FUZZ_CHECK(pes.empty() ||
                   (back.size() == 1 && back[0].regions.size() == set.regions.size()));
        for (size_t i = 0; !pes.empty() && i < set.regions.size(); ++i)
            FUZZ_CHECK(back[0].regions[i].pixels == set.regions[i].pixels);
    }
    return 0;
}
