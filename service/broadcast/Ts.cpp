#include "broadcast/Ts.h"

#include <algorithm>
#include <array>
#include <cstring>

namespace dvbmodel {

uint64_t readPts(const uint8_t* t) {
    return uint64_t{(t[0] >> 1) & 7u} << 30 | uint64_t{t[1]} << 22 | (uint64_t{t[2]} >> 1) << 15 |
           uint64_t{t[3]} << 7 | uint64_t{t[4]} >> 1;
}

void writePts(uint8_t* p, uint64_t pts) {
    p[0] = static_cast<uint8_t>(0x21 | ((pts >> 29) & 0x0E));
    p[1] = static_cast<uint8_t>(pts >> 22);
    p[2] = static_cast<uint8_t>(pts >> 14 | 1);
    p[3] = static_cast<uint8_t>(pts >> 7);
    p[4] = static_cast<uint8_t>(pts << 1 | 1);
}

void PesAssembler::complete(std::vector<std::vector<uint8_t>>& out) {
    if (!pes_.empty()) out.push_back(std::move(pes_));
    pes_.clear();
}

void PesAssembler::flush(std::vector<std::vector<uint8_t>>& out) {
    complete(out);
}

void PesAssembler::feed(const uint8_t* ts, size_t size, std::vector<std::vector<uint8_t>>& out) {
    for (size_t off = 0; ts != nullptr && off + 188 <= size; off += 188) {
        const uint8_t* p = ts + off;
        if (p[0] != 0x47 || ((p[1] & 0x1F) << 8 | p[2]) != pid_) continue;
        if (p[1] & 0x80) {  // transport error
            pes_.clear();
            continuity_ = -1;
            continue;
        }
        int afc = (p[3] >> 4) & 3, cc = p[3] & 15;
        if (!(afc & 1)) continue;
        if (cc == continuity_) continue;  // a repeated packet
        bool lost = continuity_ >= 0 && cc != ((continuity_ + 1) & 15);
        continuity_ = cc;
        size_t start = tsPayloadOffset(p);
        if (start > 188) continue;
        if (lost) pes_.clear();  // what was assembled before the gap is incomplete
        if (p[1] & 0x40) {
            complete(out);
            pes_.assign(p + start, p + 188);
        } else if (!pes_.empty()) {
            pes_.insert(pes_.end(), p + start, p + 188);
        }
        if (pes_.size() >= 6) {
            size_t length = size_t{pes_[4]} << 8 | pes_[5];
            if (length != 0 && pes_.size() >= 6 + length) {
                pes_.resize(6 + length);
                complete(out);
            }
        }
    }
}

void packetizePes(uint16_t pid, const uint8_t* head, size_t headLen, size_t n, uint8_t& continuity,
                  std::vector<uint8_t>& ts, uint8_t fill, uint8_t last) {
    size_t base = ts.size();
    ts.resize(base + (n + 183) / 184 * 188);
    uint8_t* p = ts.data() + base;
    for (size_t off = 0; off < n; p += 188) {
        size_t take = std::min<size_t>(184, n - off);
        p[0] = 0x47;
        p[1] = static_cast<uint8_t>((off == 0 ? 0x40 : 0) | (pid >> 8 & 0x1F));
        p[2] = static_cast<uint8_t>(pid);
        p[3] = static_cast<uint8_t>((take < 184 ? 0x30 : 0x10) | continuity);
        if (take < 184) {
            size_t stuffing = 183 - take;
            p[4] = static_cast<uint8_t>(stuffing);
            if (stuffing > 0) p[5] = 0x00, memset(p + 6, 0xFF, stuffing - 1);
        }
        uint8_t* dst = p + 188 - take;
        size_t fromHead = off < headLen ? std::min(take, headLen - off) : 0;
        memcpy(dst, head + off, fromHead);
        memset(dst + fromHead, fill, take - fromHead);
        continuity = (continuity + 1) & 15;
        off += take;
    }
    // The payload of the last packet ends the packet: its last byte ends the PES.
    if (n > headLen) ts.back() = last;
}

uint32_t sectionCrc32(const uint8_t* p, size_t n) {
    // A byte at a time: every section the reader assembles and the writer completes goes
    // through here.
    static constexpr auto kTable = [] {
        std::array<uint32_t, 256> t{};
        for (uint32_t b = 0; b < 256; ++b) {
            uint32_t crc = b << 24;
            for (int k = 0; k < 8; ++k) crc = crc & 0x80000000 ? crc << 1 ^ 0x04C11DB7 : crc << 1;
            t[b] = crc;
        }
        return t;
    }();
    uint32_t crc = 0xFFFFFFFF;
    for (size_t i = 0; i < n; ++i) crc = crc << 8 ^ kTable[(crc >> 24 ^ p[i]) & 0xFF];
    return crc;
}

}  // namespace dvbmodel
