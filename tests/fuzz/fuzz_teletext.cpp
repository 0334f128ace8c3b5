// The teletext decoder on PES packets of one teletext PID: the input is a series of PES packets,
// each preceded by its length (two bytes, big-endian). Every page it completes is encoded again,
// completed by a time-filling header of its magazine, and decoded by a second decoder, which
// must give it back unchanged.
#include "Harness.h"
#include "broadcast/DvbTeletext.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    using namespace dvbmodel;
    TeletextDecoder decoder;
    std::vector<TeletextPage> pages;
    // Each packet in a buffer of its own size, so that ASan sees any read past it.
    for (size_t n; size >= 2; data += 2 + n, size -= 2 + n) {
        n = std::min<size_t>(size - 2, size_t{data[0]} << 8 | data[1]);
        std::vector<uint8_t> pes(data + 2, data + 2 + n);
        decoder.feed(pes.data(), pes.size(), 0, pages);
    }
    decoder.flush(pages);
    FUZZ_CHECK(decoder.stats().pages == pages.size());
    // Every field but the time, which each decoder takes from its caller.
    const auto key = [](const TeletextPage& p) {
        return std::tie(p.number, p.subcode, p.controlBits, p.rows, p.links, p.charset);
    };
    for (const TeletextPage& page : pages) {
        TeletextPage pair[2] = {page, {}};
        pair[1].number = (page.number & 0xF00) | 0xFF;
        std::vector<uint8_t> pes = encodeTeletextPes(pair, 2, 0);
        std::vector<TeletextPage> back;
        TeletextDecoder().feed(pes.data(), pes.size(), 0, back);
        FUZZ_CHECK(back.size() == 1 && key(back[0]) == key(page));
    }
    return 0;
}
