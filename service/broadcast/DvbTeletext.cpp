#include "broadcast/DvbTeletext.h"

#include "broadcast/Ts.h"

#include <libzvbi.h>

#include <algorithm>

namespace dvbmodel {
namespace {

// A data unit as it travels: id, length, field and line, framing code, then the 42 bytes of
// the teletext packet, each sent most significant bit first (bit-reversed against the order
// of the teletext line, which libzvbi's Hamming and parity tables follow).
constexpr size_t kUnitSize = 46, kPacketSize = 42;
constexpr uint8_t kUnitLength = 0x2C, kFramingCode = 0xE4, kStuffing = 0xFF;
constexpr uint8_t kUnitTeletext = 0x02, kUnitSubtitle = 0x03;
// PES header of EN 300 472: header data length 0x24, so the data start 45 bytes in.
constexpr size_t kPesHeaderSize = 45;
constexpr uint8_t kDataIdentifier = 0x10;

// The magazine of a page number in the 3 bits that packets carry (8 travels as 0).
int magazineBits(uint16_t number) {
    return number >> 8 & 7;
}
uint16_t pageNumber(int mag, int tens, int units) {
    return static_cast<uint16_t>((mag == 0 ? 8 : mag) << 8 | tens << 4 | units);
}

}  // namespace

void TeletextDecoder::feed(const uint8_t* pes, size_t size, int64_t timeMs,
                           std::vector<TeletextPage>& out) {
    ++stats_.pes;
    if (size < 9 || pes[0] != 0 || pes[1] != 0 || pes[2] != 1 || pes[3] != 0xBD) {
        ++stats_.pesDropped;
        return;
    }
    size_t length = size_t{pes[4]} << 8 | pes[5];
    size_t end = length ? std::min(size, 6 + length) : size;
    size_t at = 9 + size_t{pes[8]};
    if (at >= end || pes[at] < 0x10 || pes[at] > 0x1F) {
        ++stats_.pesDropped;
        return;
    }
    for (++at; at + 2 <= end;) {
        uint8_t id = pes[at], n = pes[at + 1];
        bool teletext = id == kUnitTeletext || id == kUnitSubtitle;
        stats_.units += teletext;
        if (at + 2 + n > end) {
            stats_.unitsDropped += teletext;
            break;
        }
        if (teletext) {
            if (n != kUnitLength || pes[at + 3] != kFramingCode) {
                ++stats_.unitsDropped;
            } else {
                uint8_t packetBytes[kPacketSize];
                for (size_t i = 0; i < kPacketSize; ++i) packetBytes[i] = vbi_rev8(pes[at + 4 + i]);
                packet(packetBytes, timeMs, out);
            }
        }
        at += 2 + size_t{n};
    }
}

void TeletextDecoder::flush(std::vector<TeletextPage>& out) {
    for (Magazine& m : magazines_) complete(m, out);
}

void TeletextDecoder::complete(Magazine& m, std::vector<TeletextPage>& out) {
    if (!m.active) return;
    m.active = false;
    if (!m.hasCharset) m.page.charset = m.charset;
    out.push_back(m.page);
    ++stats_.pages;
}

void TeletextDecoder::text(const uint8_t* p, uint8_t* row, size_t n) {
    for (size_t i = 0; i < n; ++i) {
        int c = vbi_unpar8(p[i]);
        stats_.parityErrors += c < 0;
        row[i] = c < 0 ? ' ' : static_cast<uint8_t>(c);
    }
}

void TeletextDecoder::packet(const uint8_t* p, int64_t timeMs, std::vector<TeletextPage>& out) {
    // Not vbi_unham16p: it shifts a negative error value left.
    const int low = vbi_unham8(p[0]), high = vbi_unham8(p[1]);
    if ((low | high) < 0) {
        ++stats_.packetsDropped;
        return;
    }
    const int mag = low & 7, row = low >> 3 | high << 1;
    Magazine& m = magazines_[mag];
    if (row == 0) return header(mag, p, timeMs, out);
    // Packets 29 to 31 belong to the magazine or the service, not to the page in transmission.
    if (!m.active && row != 29) return;
    if (row <= 24) return text(p + 2, m.page.rows[row].data(), 40);
    if (row != 27 && row != 28 && row != 29) return;
    int designation = vbi_unham8(p[2]);
    if (designation < 0) {
        ++stats_.packetsDropped;
        return;
    }
    if (row == 27) {
        if (designation != 0) return;
        std::array<uint16_t, 6> links{};
        for (size_t i = 0; i < links.size(); ++i) {
            const uint8_t* l = p + 3 + 6 * i;
            int units = vbi_unham8(l[0]), tens = vbi_unham8(l[1]);
            int s2 = vbi_unham8(l[3]), s4 = vbi_unham8(l[5]);
            if ((units | tens | s2 | s4) < 0) {
                ++stats_.packetsDropped;
                return;
            }
            int relative = (s2 >> 3) | (s4 >> 1 & 6);
            if (units != 0xF || tens != 0xF) links[i] = pageNumber(mag ^ relative, tens, units);
        }
        m.page.links = links;
        return;
    }
    // X/28/0 and /4 designate the page's character sets, M/29/0 and /4 the magazine's, both
    // in the first triplet of a basic page's enhancement data.
    if (designation != 0 && designation != 4) return;
    int triplet = vbi_unham24p(p + 3);
    if (triplet < 0) {
        ++stats_.packetsDropped;
        return;
    }
    if ((triplet & 0xF) != 0) return;
    uint8_t charset = static_cast<uint8_t>(triplet >> 7 & 0x7F);
    if (row == 29) {
        m.charset = charset;
    } else {
        m.page.charset = charset;
        m.hasCharset = true;
    }
}

void TeletextDecoder::header(int mag, const uint8_t* p, int64_t timeMs,
                             std::vector<TeletextPage>& out) {
    Magazine& m = magazines_[mag];
    int f[8];
    int errors = 0;
    for (int i = 0; i < 8; ++i) errors |= f[i] = vbi_unham8(p[2 + i]);
    if (errors < 0) {
        ++stats_.packetsDropped;
        complete(m, out);
        return;
    }
    uint16_t control =
            static_cast<uint16_t>((f[3] >> 3) << 4 | (f[5] >> 2) << 5 | f[6] << 7 | f[7] << 11);
    if (control & ttx::kSerial) {
        for (Magazine& other : magazines_) complete(other, out);
    } else {
        complete(m, out);
    }
    // Page "FF" fills time: it ends the magazine's page and carries none.
    if (f[0] == 0xF && f[1] == 0xF) return;
    TeletextPage& page = m.page;
    page = TeletextPage{};
    page.time = timeMs;
    page.number = pageNumber(mag, f[1], f[0]);
    page.subcode = static_cast<uint16_t>(f[2] | (f[3] & 7) << 4 | f[4] << 8 | (f[5] & 3) << 12);
    page.controlBits = control;
    for (auto& row : page.rows) row.fill(' ');
    text(p + 10, page.rows[0].data() + 8, 32);
    m.active = true;
    m.hasCharset = false;
}

std::vector<uint8_t> encodeTeletextPes(const TeletextPage* pages, size_t count, uint64_t pts) {
    size_t packets = 0;
    for (size_t i = 0; i < count; ++i) {
        const TeletextPage& page = pages[i];
        bool linked =
                std::any_of(page.links.begin(), page.links.end(), [](uint16_t l) { return l; });
        packets += 25 + linked + (page.charset != kNoCharset);
    }
    // The PES fills whole transport payloads of 184 bytes, 4 data units each.
    size_t total = (kPesHeaderSize + 1 + packets * kUnitSize + 183) / 184 * 184;
    if (total - 6 > 0xFFFF) return {};
    std::vector<uint8_t> pes;
    pes.reserve(total);
    pes.insert(pes.end(), {0, 0, 1, 0xBD, static_cast<uint8_t>((total - 6) >> 8),
                           static_cast<uint8_t>(total - 6), 0x84, 0x80, 0x24, 0, 0, 0, 0, 0});
    writePts(pes.data() + 9, pts);
    pes.resize(kPesHeaderSize, kStuffing);
    pes.push_back(kDataIdentifier);
    size_t sent = 0;

    for (size_t i = 0; i < count; ++i) {
        const TeletextPage& page = pages[i];
        const int mag = magazineBits(page.number);
        const uint8_t unitId = page.controlBits & ttx::kSubtitle ? kUnitSubtitle : kUnitTeletext;
        uint8_t p[kPacketSize];
        auto send = [&](int row) {
            p[0] = vbi_ham8(mag | (row & 1) << 3);
            p[1] = vbi_ham8(row >> 1);
            // Lines 7..22 of the first field, then of the second, in turn: a demultiplexer that
            // groups lines into video frames sees a new frame every 32 packets.
            const uint8_t line = static_cast<uint8_t>(7 + sent % 16), first = sent / 16 % 2 == 0;
            ++sent;
            pes.insert(pes.end(), {unitId, kUnitLength,
                                   static_cast<uint8_t>(0xC0 | first << 5 | line), kFramingCode});
            for (uint8_t b : p) pes.push_back(vbi_rev8(b));
        };
        auto put = [&](size_t at, const uint8_t* chars, size_t n) {
            for (size_t c = 0; c < n; ++c) p[at + c] = vbi_par8(chars[c] & 0x7F);
        };
        const uint16_t c = page.controlBits, s = page.subcode;
        const int fields[8] = {page.number & 0xF, page.number >> 4 & 0xF,
                               s & 0xF,           (s >> 4 & 7) | (c >> 4 & 1) << 3,
                               s >> 8 & 0xF,      (s >> 12 & 3) | (c >> 5 & 3) << 2,
                               c >> 7 & 0xF,      c >> 11 & 0xF};
        for (int f = 0; f < 8; ++f) p[2 + f] = vbi_ham8(fields[f]);
        put(10, page.rows[0].data() + 8, 32);
        send(0);
        if (std::any_of(page.links.begin(), page.links.end(), [](uint16_t l) { return l; })) {
            p[2] = vbi_ham8(0);
            for (size_t l = 0; l < page.links.size(); ++l) {
                uint16_t link = page.links[l];
                int relative = link ? magazineBits(link) ^ mag : 0;
                int units = link ? link & 0xF : 0xF, tens = link ? link >> 4 & 0xF : 0xF;
                // Any subcode: S1..S4 all ones.
                const int nibbles[6] = {
                        units, tens, 0xF, 7 | (relative & 1) << 3, 0xF, 3 | (relative >> 1) << 2};
                for (int k = 0; k < 6; ++k) p[3 + 6 * l + k] = vbi_ham8(nibbles[k]);
            }
            p[39] = vbi_ham8(0xF);  // link control: row 24 shows the links
            p[40] = p[41] = 0;      // no page check word
            send(27);
        }
        if (page.charset != kNoCharset) {
            p[2] = vbi_ham8(0);
            // Triplet 1: a basic level 1 page in 7-bit odd parity with its character sets;
            // triplets 2..13 leave the other sets, side panels and colours at their defaults.
            vbi_ham24p(p + 3, unsigned{page.charset} << 7);
            for (int t = 1; t < 13; ++t) vbi_ham24p(p + 3 + 3 * t, 0);
            send(28);
        }
        for (int row = 1; row <= 24; ++row) {
            put(2, page.rows[row].data(), 40);
            send(row);
        }
    }
    while (pes.size() < total) {
        pes.insert(pes.end(), {kStuffing, kUnitLength});
        pes.resize(pes.size() + kUnitLength, kStuffing);
    }
    return pes;
}

}  // namespace dvbmodel
