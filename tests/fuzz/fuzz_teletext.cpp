// The teletext decoder on PES packets of one teletext PID: the input is a series of PES packets,
// each preceded by its length (two bytes, big-endian). Every page it completes is encoded again,
// completed by a time-filling header of its magazine, and decoded by a second decoder, which
// must give it back unchanged.
#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <tuple>
#include <vector>

#include "Harness.h"
#include "broadcast/DvbTeletext.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    using namespace dvbmodel;
    TeletextDecoder decoder;
    std::vector<TeletextPage> pages;
    while (size >= 2) {
        size_t n = std::min<size_t>(size - 2, size_t{data[0]} << 8 | data[1]);
        // Each packet in a buffer of its own size, so that ASan sees any read past it.
        std::vector<uint8_t> pes(data + 2, data + 2 + n);
        decoder.feed(pes.data(), pes.size(), 0, pages);
        data += 2 + n, size -= 2 + n;
    }
    decoder.flush(pages);
    FUZZ_CHECK(decoder.stats().pages == pages.size());
    for (const TeletextPage& page : pages) {
        TeletextPage pair[2] = {page, {}};
        pair[1].number = (page.number & 0xF00) | 0xFF;
        std::vector<uint8_t> pes = encodeTeletextPes(pair, 2, 0);
        TeletextDecoder again;
        std::vector<TeletextPage> back;
        again.feed(pes.data(), pes.size(), 0, back);
        FUZZ_CHECK(back.size() == 1);
        FUZZ_CHECK(std::tie(back[0].number, back[0].subcode, back[0].controlBits, back[0].rows,
                            back[0].links, back[0].charset) == std::tie(page.number, page.subcode,
                                                                        page.controlBits, page.rows,
                                                                        page.links, page.charset));
    }
    return 0;
}
