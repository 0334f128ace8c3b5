// Teletext (EN 300 706 pages carried in PES data units per EN 300 472) in both directions: a
// decoder that turns the PES packets of one teletext PID into pages of the broadcast model, and
// an encoder that writes pages back as one PES packet.
//
// Broadcast data is damaged as a rule: the decoder keeps every packet whose Hamming-coded
// address and fields decode, drops the others (counted in TeletextStats), shows a character
// whose parity fails as a space, and never reads outside the PES it is given.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <vector>

#include "broadcast/Broadcast.h"

namespace dvbmodel {

struct TeletextStats {
    uint32_t pes = 0, pesDropped = 0, units = 0, unitsDropped = 0,
             packetsDropped = 0 /* Hamming errors that cannot be corrected */, pages = 0;
    uint32_t parityErrors = 0;  // characters received with even parity, kept as spaces
};

// Decodes the PES packets (EN 300 472 data units 0x02/0x03) of one teletext PID into pages
// of the model (TeletextPage in Broadcast.h). A page is complete when the next header of its
// magazine arrives (or at flush); it is appended to `out` with `time` = the timeMs of the PES
// that carried its header.
//
// In serial mode (C11 set in a header) any header completes the page of every magazine. Each
// transmission starts from a blank page (spaces): rows the broadcaster did not send stay blank.
// A header whose page number is "FF" (time filling) completes its magazine's page and starts
// none. Rows of a magazine that has no page in transmission are ignored. A packet with a
// Hamming error that cannot be corrected in any Hamming-coded byte (address, page address,
// control bits, link or designation) is dropped; a header dropped so still ends its
// magazine's page, since the magazine has moved on, and that magazine's rows are ignored until
// its next sound header.
class TeletextDecoder {
public:
    void feed(const uint8_t* pes, size_t size, int64_t timeMs, std::vector<TeletextPage>& out);
    void flush(std::vector<TeletextPage>& out);
    const TeletextStats& stats() const { return stats_; }

private:
    struct Magazine {
        bool active = false;
        bool hasCharset = false;       // an X/28 designation came for the page
        uint8_t charset = kNoCharset;  // of the magazine's M/29, for its pages without X/28
        TeletextPage page;
    };

    void packet(const uint8_t* p, int64_t timeMs, std::vector<TeletextPage>& out);
    void header(int mag, const uint8_t* p, int64_t timeMs, std::vector<TeletextPage>& out);
    void complete(Magazine& m, std::vector<TeletextPage>& out);
    void text(const uint8_t* p, uint8_t* row, size_t n);

    std::array<Magazine, 8> magazines_;
    TeletextStats stats_;
};

// Pages sent at one moment as one PES packet of data units (0x03 for pages whose control
// bits carry the subtitle flag C6, 0x02 otherwise) with `pts`.
//
// Each page goes as its header X/0 (columns 8..39 of row 0), X/27/0 when it has a link, X/28/0
// when it carries a character set designation, then X/1..X/24. Links go with "any subcode".
// The PES header is padded to the fixed 45 bytes of EN 300 472 and the packet is filled with
// stuffing units to a whole number of 184-byte transport payloads. Pages that do not fit one
// PES (its length field past 65535 bytes: over 1423 data units, some 54 pages) give an empty
// result.
std::vector<uint8_t> encodeTeletextPes(const TeletextPage* pages, size_t count, uint64_t pts);

}  // namespace dvbmodel
