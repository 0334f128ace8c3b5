// MPEG transport stream basics (ISO/IEC 13818-1) that the reader, the writer and the subtitle
// and teletext codecs share: packet payloads, PES time stamps, PES packets into and out of
// transport packets, and the section CRC.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

namespace dvbmodel {

// PTS, DTS and PCR bases count 90 kHz ticks modulo 2^33 (about 26.5 hours).
constexpr int64_t kPtsWrap = int64_t{1} << 33;

// `pts` less `ref`, the shorter way round the wrap: negative when `pts` comes first.
inline int64_t ptsDelta(uint64_t pts, uint64_t ref) {
    int64_t d = static_cast<int64_t>((pts - ref) & (kPtsWrap - 1));
    return d >= kPtsWrap / 2 ? d - kPtsWrap : d;
}

// MSB-first bits into a byte vector, as MPEG and DVB syntax writes them.
class BitWriter {
public:
    explicit BitWriter(std::vector<uint8_t>& out) : out_(out) {}
    void put(uint32_t value, int bits) {
        for (int i = bits - 1; i >= 0; --i) {
            acc_ = static_cast<uint8_t>(acc_ << 1 | (value >> i & 1));
            if (++n_ == 8) out_.push_back(acc_), acc_ = 0, n_ = 0;
        }
    }
    // Zero bits up to the next byte.
    void align() {
        if (n_ > 0) put(0, 8 - n_);
    }

private:
    std::vector<uint8_t>& out_;
    uint8_t acc_ = 0;
    int n_ = 0;
};

// A PES header's 33-bit time stamp from its 5 bytes (marker bits not checked: a bit error in
// one leaves the time), and the 5 bytes of `pts` as a PTS-only header writes them ('0010').
uint64_t readPts(const uint8_t* five);
void writePts(uint8_t* five, uint64_t pts);

// Where a 188-byte transport packet's payload starts: after its header and, where it has one,
// its adaptation field (a value over 188 says the field's length byte is broken).
inline size_t tsPayloadOffset(const uint8_t* packet) {
    return (packet[3] & 0x20) ? 5 + size_t{packet[4]} : 4;
}

// The PES packets of one PID, reassembled from 188-byte transport packets. A packet lost on
// the way (continuity counter) or a transport error drops the PES being assembled.
class PesAssembler {
public:
    explicit PesAssembler(uint16_t pid) : pid_(pid) {}

    // Any number of transport packets (a partial one at the end is ignored); completed PES
    // packets are appended to `out`.
    void feed(const uint8_t* ts, size_t size, std::vector<std::vector<uint8_t>>& out);
    // The PES still being assembled, if any, as it is.
    void flush(std::vector<std::vector<uint8_t>>& out);

private:
    void complete(std::vector<std::vector<uint8_t>>& out);

    uint16_t pid_;
    int continuity_ = -1;
    std::vector<uint8_t> pes_;
};

// Appends one PES packet of `n` bytes as transport packets of `pid`: its first `headLen`
// bytes from `head`, the others `fill` but the very last, `last` (so that a payload of no
// content of its own, a stand-in audio frame, needs no buffer); the last packet is padded with
// adaptation field stuffing. `continuity` is the PID's counter, advanced per packet.
void packetizePes(uint16_t pid, const uint8_t* head, size_t headLen, size_t n, uint8_t& continuity,
                  std::vector<uint8_t>& ts, uint8_t fill = 0, uint8_t last = 0);
inline void packetizePes(uint16_t pid, const std::vector<uint8_t>& pes, uint8_t& continuity,
                         std::vector<uint8_t>& ts) {
    packetizePes(pid, pes.data(), pes.size(), pes.size(), continuity, ts);
}

// CRC-32/MPEG-2 (ISO/IEC 13818-1 annex A) of `n` bytes: 0 over a whole section that is sound.
uint32_t sectionCrc32(const uint8_t* p, size_t n);

}  // namespace dvbmodel
