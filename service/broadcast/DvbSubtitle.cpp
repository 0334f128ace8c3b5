#include "broadcast/DvbSubtitle.h"
#include "broadcast/Ts.h"

#include <algorithm>

namespace dvbmodel {

namespace {

enum SegmentType : uint8_t {
    kPageComposition = 0x10,
    kRegionComposition = 0x11,
    kClutDefinition = 0x12,
    kObjectData = 0x13,
    kDisplayDefinition = 0x14,
    kDisparitySignalling = 0x15,
    kAlternativeClut = 0x16,
    kEndOfDisplaySet = 0x80,
    kStuffing = 0xFF,
};

// A region is at most a full HD display, and an epoch holds at most four of those: enough
// for any broadcast, and a bound on what a damaged or hostile stream can make us allocate.
constexpr size_t kMaxRegionPixels = 1920 * 1080;
constexpr size_t kMaxEpochPixels = 4 * kMaxRegionPixels;

uint16_t be16(const uint8_t* p) {
    return static_cast<uint16_t>(p[0] << 8 | p[1]);
}

// Reads bits most significant first; past the end it reads zeros and remembers the overrun.
class BitReader {
public:
    BitReader(const uint8_t* p, size_t n) : p_(p), bits_(n * 8) {}
    uint32_t read(int count) {
        uint32_t v = 0;
        for (; count > 0; --count, ++pos_) {
            v <<= 1;
            if (pos_ < bits_) v |= (p_[pos_ >> 3] >> (7 - (pos_ & 7))) & 1u;
        }
        return v;
    }
    uint32_t peek(int count) {
        size_t at = pos_;
        uint32_t v = read(count);
        pos_ = at;
        return v;
    }
    bool overrun() const { return pos_ > bits_; }
    // Bytes used, the last one counted whole.
    size_t bytes() const { return (pos_ + 7) / 8; }

private:
    const uint8_t* p_;
    size_t bits_;
    size_t pos_ = 0;
};

// Rounds num / den (den > 0) to the nearest integer, halves away from zero.
int roundDiv(int64_t num, int64_t den) {
    return static_cast<int>(num >= 0 ? (num + den / 2) / den : -((-num + den / 2) / den));
}

// A colour level given in sixths of full scale (the standard's 100 %, 66.7 %, 50 %, 33.3 %
// and 16.7 % are 6, 4, 3, 2 and 1 sixths), as 0..255.
int level(int sixths) {
    return roundDiv(sixths * 255, 6);
}

// One colour in the Y/Cr/Cb/T form: BT.601 studio range (Y 16..235), rounded to the nearest.
ClutEntry yccOf(int r, int g, int b, int t) {
    const int y = 16 + roundDiv(65481LL * r + 128553LL * g + 24966LL * b, 255000);
    const int cb = 128 + roundDiv(-37797LL * r - 74203LL * g + 112000LL * b, 255000);
    const int cr = 128 + roundDiv(112000LL * r - 93786LL * g - 18214LL * b, 255000);
    return {static_cast<uint8_t>(y), static_cast<uint8_t>(cr), static_cast<uint8_t>(cb),
            static_cast<uint8_t>(t)};
}

constexpr ClutEntry kTransparent{0, 128, 128, 255};

// An entry of a default table from its levels in sixths and its transparency in percent.
ClutEntry entry(int r, int g, int b, int transparency) {
    return yccOf(level(r), level(g), level(b), roundDiv(transparency * 255, 100));
}

Clut makeDefaultClut() {
    Clut c;
    // 2 bit: transparent, white, black, 50 % grey.
    c.c2 = {kTransparent, entry(6, 6, 6, 0), entry(0, 0, 0, 0), entry(3, 3, 3, 0)};
    // 4 bit, entry bits b1 b2 b3 b4 (b1 the highest): b4 red, b3 green, b2 blue, at full level
    // when b1 is 0 and at half level when it is 1.
    for (int i = 0; i < 16; ++i) {
        const int full = (i & 8) != 0 ? 3 : 6;
        c.c4[i] = i == 0 ? kTransparent
                         : entry((i & 1) * full, (i >> 1 & 1) * full, (i >> 2 & 1) * full, 0);
    }
    // 8 bit, entry bits b1 .. b8 (b1 the highest): b8, b7, b6 the low part of red, green and
    // blue, b4, b3, b2 their high part; b1 and b5 choose the range and the transparency.
    for (int i = 0; i < 256; ++i) {
        const int lo[3] = {i & 1, i >> 1 & 1, i >> 2 & 1};
        const int hi[3] = {i >> 4 & 1, i >> 5 & 1, i >> 6 & 1};
        const bool b1 = (i & 0x80) != 0, b5 = (i & 0x08) != 0;
        int rgb[3];
        int transparency = 0;
        for (int k = 0; k < 3; ++k) {
            // 33.3 % and 66.7 %; or 16.7 % and 33.3 %, + 50 % unless b5.
            rgb[k] = !b1 ? lo[k] * 2 + hi[k] * 4 : lo[k] + hi[k] * 2 + (b5 ? 0 : 3);
        }
        if (!b1 && !b5) {
            if (i == 0) {
                c.c8[i] = kTransparent;
                continue;
            }
            // Entries 1..7: the full colours at 75 % transparency.
            if ((i & 0x70) == 0) {
                for (int k = 0; k < 3; ++k) rgb[k] = lo[k] * 6;
                transparency = 75;
            }
        } else if (!b1 && b5) {
            transparency = 50;
        }
        c.c8[i] = entry(rgb[0], rgb[1], rgb[2], transparency);
    }
    return c;
}

// The pixel depth of a region or string: 2, 4 or 8 bits for the codes 1, 2, 3.
int depthBits(uint8_t code) {
    return code == 1 ? 2 : code == 2 ? 4 : code == 3 ? 8 : 0;
}

}  // namespace

const Clut& defaultClut() {
    static const Clut c = makeDefaultClut();
    return c;
}

// ---- decoding ----------------------------------------------------------------------------

DvbSubtitleDecoder::DvbSubtitleDecoder(uint16_t compositionPageId, uint16_t ancillaryPageId)
    : composition_(compositionPageId), ancillary_(ancillaryPageId) {
    set_.pageId = composition_;
}

void DvbSubtitleDecoder::feed(const uint8_t* p, size_t size, std::vector<DisplaySet>& out) {
    ++stats_.pes;
    // Start code, private stream 1, a PES header of the MPEG-2 form.
    if (p == nullptr || size < 9 || p[0] != 0 || p[1] != 0 || p[2] != 1 || p[3] != 0xBD ||
        (p[6] & 0xC0) != 0x80) {
        ++stats_.pesDropped;
        return;
    }
    size_t declared = be16(p + 4);
    size_t end = declared == 0 ? size : std::min(size, 6 + declared);
    size_t pos = 9 + size_t{p[8]};
    if (pos + 2 > end || p[pos] != 0x20 || p[pos + 1] != 0x00) {
        ++stats_.pesDropped;
        return;
    }
    // The PTS is taken even where a bit error broke its marker bits.
    if ((p[7] & 0x80) && p[8] >= 5) pts_ = readPts(p + 9);
    pos += 2;
    while (pos < end && p[pos] != 0xFF) {
        if (p[pos] != 0x0F || pos + 6 > end) {
            ++stats_.segmentsDropped;
            return;
        }
        uint8_t type = p[pos + 1];
        uint16_t page = be16(p + pos + 2);
        size_t length = be16(p + pos + 4);
        pos += 6;
        if (length > end - pos) {
            ++stats_.segmentsDropped;
            return;
        }
        if (page == composition_ || page == ancillary_) {
            // A page composition belongs to the composition page alone.
            if (type == kPageComposition && page != composition_) {
                ++stats_.segmentsDropped;
            } else {
                segment(type, p + pos, length, out);
            }
        }
        pos += length;
    }
}

void DvbSubtitleDecoder::segment(uint8_t type, const uint8_t* p, size_t n,
                                 std::vector<DisplaySet>& out) {
    bool ok = true;
    switch (type) {
        case kPageComposition:
            ok = pageComposition(p, n, out);
            break;
        case kRegionComposition:
            ok = regionComposition(p, n);
            break;
        case kClutDefinition:
            ok = clutDefinition(p, n);
            break;
        case kObjectData:
            ok = objectData(p, n);
            break;
        case kDisplayDefinition:
            ok = displayDefinition(p, n);
            break;
        case kEndOfDisplaySet:
            if (pending_) emit(out);
            break;
        // Known, and nothing that a display set holds.
        case kDisparitySignalling:
        case kAlternativeClut:
        case kStuffing:
            break;
        default:
            ok = false;
    }
    if (ok) {
        ++stats_.segments;
    } else {
        ++stats_.segmentsDropped;
    }
}

void DvbSubtitleDecoder::newEpoch() {
    set_.placements.clear();
    set_.regions.clear();
    set_.cluts.clear();
    objects_.clear();
    pixelsHeld_ = 0;
    havePage_ = false;
}

void DvbSubtitleDecoder::emit(std::vector<DisplaySet>& out) {
    for (const RegionRef& placed : set_.placements) {
        for (const Region& r : set_.regions) {
            if (r.id != placed.id) continue;
            bool found = std::any_of(set_.cluts.begin(), set_.cluts.end(),
                                     [&r](const Clut& c) { return c.id == r.clutId; });
            if (!found) ++stats_.missingCluts;
        }
    }
    out.push_back(set_);
    pending_ = false;
    ++stats_.displaySets;
}

bool DvbSubtitleDecoder::pageComposition(const uint8_t* p, size_t n, std::vector<DisplaySet>& out) {
    if (n < 2) return false;
    if (pending_) emit(out);
    uint8_t version = p[1] >> 4, state = (p[1] >> 2) & 3;
    set_.pts = pts_;
    set_.time = static_cast<int64_t>(pts_ / 90);
    pending_ = true;
    if (state == 1 || state == 2) {
        newEpoch();
    } else if (havePage_ && version == set_.version) {
        return true;
    }
    set_.timeout = p[0];
    set_.version = version;
    set_.state = state;
    set_.placements.clear();
    // Whole placements only: a tail cut short by damage is left out.
    for (size_t i = 2; i + 6 <= n; i += 6) {
        set_.placements.push_back(RegionRef{p[i], be16(p + i + 2), be16(p + i + 4)});
    }
    havePage_ = true;
    return true;
}

bool DvbSubtitleDecoder::regionComposition(const uint8_t* p, size_t n) {
    if (n < 10) return false;
    Region r;
    r.id = p[0];
    r.version = p[1] >> 4;
    r.fill = (p[1] >> 3) & 1;
    r.width = be16(p + 2);
    r.height = be16(p + 4);
    r.levelOfCompatibility = p[6] >> 5;
    r.depth = (p[6] >> 2) & 7;
    r.clutId = p[7];
    r.background8 = p[8];
    r.background4 = p[9] >> 4;
    r.background2 = (p[9] >> 2) & 3;
    if (depthBits(r.depth) == 0) return false;
    for (size_t i = 10; i < n;) {
        if (i + 6 > n) return false;
        ObjectRef o;
        o.id = be16(p + i);
        o.type = p[i + 2] >> 6;
        o.x = be16(p + i + 2) & 0x0FFF;
        o.y = be16(p + i + 4) & 0x0FFF;
        i += 6;
        if (o.type == 1 || o.type == 2) {
            if (i + 2 > n) return false;
            o.foreground = p[i];
            o.background = p[i + 1];
            i += 2;
        }
        r.objects.push_back(std::move(o));
    }
    auto old = std::find_if(set_.regions.begin(), set_.regions.end(),
                            [&r](const Region& e) { return e.id == r.id; });
    if (old != set_.regions.end() && old->version == r.version) return true;
    size_t pixels = size_t{r.width} * r.height;
    size_t heldBefore = pixelsHeld_ - (old == set_.regions.end() ? 0 : old->pixels.size());
    if (pixels > kMaxRegionPixels || heldBefore + pixels > kMaxEpochPixels) {
        ++stats_.regionsDropped;
        return true;
    }
    // An update of the same size keeps the pixels drawn so far, unless it asks for a fill.
    if (old != set_.regions.end() && old->pixels.size() == pixels) r.pixels.swap(old->pixels);
    r.pixels.resize(pixels, 0);
    if (r.fill) {
        uint8_t code = r.depth == 1 ? r.background2 : r.depth == 2 ? r.background4 : r.background8;
        std::fill(r.pixels.begin(), r.pixels.end(), code);
    }
    pixelsHeld_ = heldBefore + pixels;
    // Objects this region places are drawn into it again when their data comes, whatever
    // their version.
    objects_.erase(std::remove_if(objects_.begin(), objects_.end(),
                                  [&r](const ObjectVersion& v) {
                                      return std::any_of(
                                              r.objects.begin(), r.objects.end(),
                                              [&v](const ObjectRef& o) { return o.id == v.id; });
                                  }),
                   objects_.end());
    if (old != set_.regions.end()) {
        *old = std::move(r);
    } else {
        set_.regions.push_back(std::move(r));
    }
    return true;
}

bool DvbSubtitleDecoder::clutDefinition(const uint8_t* p, size_t n) {
    if (n < 2) return false;
    uint8_t id = p[0], version = p[1] >> 4;
    auto old = std::find_if(set_.cluts.begin(), set_.cluts.end(),
                            [id](const Clut& c) { return c.id == id; });
    if (old != set_.cluts.end() && old->version == version) return true;
    Clut c = old != set_.cluts.end() ? *old : defaultClut();
    c.id = id;
    c.version = version;
    for (size_t i = 2; i < n;) {
        if (i + 2 > n) return false;
        uint8_t entry = p[i], flags = p[i + 1];
        bool full = flags & 1;
        if (i + (full ? 6 : 4) > n) return false;
        const uint8_t* v = p + i + 2;
        // The reduced range carries the most significant bits of each value.
        ClutEntry e = full ? ClutEntry{v[0], v[1], v[2], v[3]}
                           : ClutEntry{static_cast<uint8_t>(v[0] & 0xFC),
                                       static_cast<uint8_t>(((v[0] & 3) << 2 | v[1] >> 6) << 4),
                                       static_cast<uint8_t>(((v[1] >> 2) & 0x0F) << 4),
                                       static_cast<uint8_t>((v[1] & 3) << 6)};
        i += full ? 6 : 4;
        if ((flags & 0x80) && entry < 4) c.c2[entry] = e;
        if ((flags & 0x40) && entry < 16) c.c4[entry] = e;
        if (flags & 0x20) c.c8[entry] = e;
    }
    if (old != set_.cluts.end()) {
        *old = c;
    } else {
        set_.cluts.push_back(c);
    }
    return true;
}

bool DvbSubtitleDecoder::displayDefinition(const uint8_t* p, size_t n) {
    if (n < 5) return false;
    bool windowed = (p[0] >> 3) & 1;
    if (windowed && n < 13) return false;
    uint8_t version = p[0] >> 4;
    if (set_.hasDisplay && set_.displayVersion == version) return true;
    set_.hasDisplay = true;
    set_.displayVersion = version;
    set_.displayWidth = static_cast<uint16_t>(be16(p + 1) + 1);
    set_.displayHeight = static_cast<uint16_t>(be16(p + 3) + 1);
    set_.windowed = windowed;
    set_.windowX = windowed ? be16(p + 5) : 0;
    set_.windowMaxX = windowed ? be16(p + 7) : 0;
    set_.windowY = windowed ? be16(p + 9) : 0;
    set_.windowMaxY = windowed ? be16(p + 11) : 0;
    return true;
}

bool DvbSubtitleDecoder::objectData(const uint8_t* p, size_t n) {
    if (n < 3) return false;
    uint16_t id = be16(p);
    uint8_t version = p[2] >> 4, coding = (p[2] >> 2) & 3;
    bool nonModifying = (p[2] >> 1) & 1;
    auto known = std::find_if(objects_.begin(), objects_.end(),
                              [id](const ObjectVersion& v) { return v.id == id; });
    if (known != objects_.end() && known->version == version) return true;
    if (coding == 0) {
        if (n < 7) return false;
        size_t top = be16(p + 3), bottom = be16(p + 5);
        if (7 + top + bottom > n) {
            ++stats_.objectsDropped;
            return true;
        }
        // Without a bottom field block the top field's lines are repeated for it.
        const uint8_t* bottomData = bottom == 0 ? p + 7 : p + 7 + top;
        size_t bottomSize = bottom == 0 ? top : bottom;
        for (Region& r : set_.regions) {
            for (const ObjectRef& o : r.objects) {
                if (o.id == id && o.type == 0) {
                    drawObject(r, o, p + 7, top, bottomData, bottomSize, nonModifying);
                }
            }
        }
    } else if (coding == 1) {
        size_t count = n >= 4 ? p[3] : 0;
        if (n < 4 || 4 + 2 * count > n) {
            ++stats_.objectsDropped;
            return true;
        }
        for (Region& r : set_.regions) {
            for (ObjectRef& o : r.objects) {
                if (o.id != id || o.type == 0) continue;
                o.text.clear();
                for (size_t i = 0; i < count; ++i) o.text.push_back(be16(p + 4 + 2 * i));
            }
        }
    } else {
        ++stats_.objectsDropped;
        return true;
    }
    if (known != objects_.end()) {
        known->version = version;
    } else {
        objects_.push_back(ObjectVersion{id, version});
    }
    return true;
}

void DvbSubtitleDecoder::drawObject(Region& r, const ObjectRef& o, const uint8_t* top,
                                    size_t topSize, const uint8_t* bottom, size_t bottomSize,
                                    bool nonModifying) {
    drawField(r, o.x, o.y, top, topSize, nonModifying);
    drawField(r, o.x, o.y + 1, bottom, bottomSize, nonModifying);
}

void DvbSubtitleDecoder::drawField(Region& r, int x0, int y, const uint8_t* p, size_t n,
                                   bool nonModifying) {
    // Map tables start from their defaults in every field block.
    uint8_t map24[4] = {0x0, 0x7, 0x8, 0xF};
    uint8_t map28[4] = {0x00, 0x77, 0x88, 0xFF};
    uint8_t map48[16];
    for (int i = 0; i < 16; ++i) map48[i] = static_cast<uint8_t>(i * 0x11);
    const int regionBits = depthBits(r.depth);
    const int width = r.width, height = r.height;
    int x = x0;
    bool deeper = false;  // the string's codes are deeper than the region: drawn nowhere

    auto run = [&](int count, uint32_t code, int bits) {
        if (deeper || count <= 0) {
            x += count;
            return;
        }
        uint8_t value = static_cast<uint8_t>(code);
        if (bits == 2 && regionBits == 4) value = map24[code & 3];
        if (bits == 2 && regionBits == 8) value = map28[code & 3];
        if (bits == 4 && regionBits == 8) value = map48[code & 15];
        int from = std::max(x, 0), to = std::min(x + count, width);
        if (y < 0 || y >= height || to < x + count) ++stats_.runsClipped;
        // The non-modifying colour leaves what is beneath it.
        if (!(nonModifying && code == 1) && y >= 0 && y < height && from < to) {
            std::fill_n(r.pixels.begin() + (static_cast<size_t>(y) * width + from), to - from,
                        value);
        }
        x += count;
    };

    size_t i = 0;
    while (i < n) {
        uint8_t type = p[i++];
        if (type == 0x10 || type == 0x11 || type == 0x12) {
            int bits = type == 0x10 ? 2 : type == 0x11 ? 4 : 8;
            deeper = bits > regionBits;
            if (deeper) ++stats_.stringsDropped;
            BitReader in(p + i, n - i);
            bool more = true;
            while (more && !in.overrun()) {
                if (bits == 2) {
                    uint32_t c = in.read(2);
                    if (c != 0) {
                        run(1, c, 2);
                    } else if (in.read(1)) {
                        int count = 3 + static_cast<int>(in.read(3));
                        run(count, in.read(2), 2);
                    } else if (in.read(1)) {
                        run(1, 0, 2);
                    } else {
                        switch (in.read(2)) {
                            case 0:
                                more = false;
                                break;
                            case 1:
                                run(2, 0, 2);
                                break;
                            case 2: {
                                int count = 12 + static_cast<int>(in.read(4));
                                run(count, in.read(2), 2);
                                break;
                            }
                            default: {
                                int count = 29 + static_cast<int>(in.read(8));
                                run(count, in.read(2), 2);
                            }
                        }
                    }
                } else if (bits == 4) {
                    uint32_t c = in.read(4);
                    if (c != 0) {
                        run(1, c, 4);
                    } else if (in.read(1) == 0) {
                        uint32_t count = in.read(3);
                        if (count == 0) {
                            more = false;
                        } else {
                            run(static_cast<int>(count) + 2, 0, 4);
                        }
                    } else if (in.read(1) == 0) {
                        int count = 4 + static_cast<int>(in.read(2));
                        run(count, in.read(4), 4);
                    } else {
                        switch (in.read(2)) {
                            case 0:
                                run(1, 0, 4);
                                break;
                            case 1:
                                run(2, 0, 4);
                                break;
                            case 2: {
                                int count = 9 + static_cast<int>(in.read(4));
                                run(count, in.read(4), 4);
                                break;
                            }
                            default: {
                                int count = 25 + static_cast<int>(in.read(8));
                                run(count, in.read(4), 4);
                            }
                        }
                    }
                } else {
                    uint32_t c = in.read(8);
                    if (c != 0) {
                        run(1, c, 8);
                    } else if (in.read(1) == 0) {
                        uint32_t count = in.read(7);
                        if (count == 0) {
                            more = false;
                        } else {
                            run(static_cast<int>(count), 0, 8);
                        }
                    } else {
                        int count = static_cast<int>(in.read(7));
                        run(count, in.read(8), 8);
                    }
                }
            }
            // A string cut off by the end of its block ends the block.
            if (in.overrun()) return;
            i += in.bytes();
            deeper = false;
        } else if (type == 0x20) {
            if (i + 2 > n) return;
            for (int k = 0; k < 4; ++k) map24[k] = (p[i + k / 2] >> (k % 2 ? 0 : 4)) & 0x0F;
            i += 2;
        } else if (type == 0x21) {
            if (i + 4 > n) return;
            std::copy(p + i, p + i + 4, map28);
            i += 4;
        } else if (type == 0x22) {
            if (i + 16 > n) return;
            std::copy(p + i, p + i + 16, map48);
            i += 16;
        } else if (type == 0xF0) {
            x = x0;
            y += 2;
        } else {
            // An unknown data type: nothing after it can be trusted.
            return;
        }
    }
}

// ---- encoding ----------------------------------------------------------------------------

namespace {

// Opens a segment; the returned offset is where closeSegment writes its length.
size_t openSegment(std::vector<uint8_t>& out, uint8_t type, uint16_t page) {
    out.insert(out.end(),
               {0x0F, type, static_cast<uint8_t>(page >> 8), static_cast<uint8_t>(page), 0, 0});
    return out.size();
}

bool closeSegment(std::vector<uint8_t>& out, size_t body) {
    size_t length = out.size() - body;
    out[body - 2] = static_cast<uint8_t>(length >> 8);
    out[body - 1] = static_cast<uint8_t>(length);
    return length <= 0xFFFF;
}

void put16(std::vector<uint8_t>& out, uint32_t v) {
    out.push_back(static_cast<uint8_t>(v >> 8));
    out.push_back(static_cast<uint8_t>(v));
}

// One run of `count` pixels of `code` in the codes of a 2-, 4- or 8-bit pixel string,
// longest codes first.
void encodeRun(BitWriter& w, int bits, uint32_t code, int count) {
    while (count > 0) {
        if (bits == 2) {
            if (count >= 29) {
                int n = std::min(count, 284);
                w.put(0, 2), w.put(0, 2), w.put(3, 2), w.put(n - 29, 8), w.put(code, 2);
                count -= n;
            } else if (count >= 12) {
                int n = std::min(count, 27);
                w.put(0, 2), w.put(0, 2), w.put(2, 2), w.put(n - 12, 4), w.put(code, 2);
                count -= n;
            } else if (count >= 3) {
                int n = std::min(count, 10);
                w.put(0, 2), w.put(1, 1), w.put(n - 3, 3), w.put(code, 2);
                count -= n;
            } else if (code != 0) {
                w.put(code, 2), --count;
            } else if (count == 2) {
                w.put(0, 2), w.put(0, 2), w.put(1, 2), count -= 2;
            } else {
                w.put(0, 2), w.put(1, 2), --count;
            }
        } else if (bits == 4) {
            if (count >= 25) {
                int n = std::min(count, 280);
                w.put(0, 4), w.put(3, 2), w.put(3, 2), w.put(n - 25, 8), w.put(code, 4);
                count -= n;
            } else if (count >= 9) {
                w.put(0, 4), w.put(3, 2), w.put(2, 2), w.put(count - 9, 4), w.put(code, 4);
                count = 0;
            } else if (code == 0 && count >= 3) {
                w.put(0, 4), w.put(0, 1), w.put(count - 2, 3), count = 0;
            } else if (code == 0) {
                w.put(0, 4), w.put(3, 2), w.put(count - 1, 2), count = 0;
            } else if (count >= 4) {
                int n = std::min(count, 7);
                w.put(0, 4), w.put(2, 2), w.put(n - 4, 2), w.put(code, 4);
                count -= n;
            } else {
                w.put(code, 4), --count;
            }
        } else {
            int n = std::min(count, 127);
            if (code == 0) {
                w.put(0, 8), w.put(0, 1), w.put(n, 7);
            } else if (n >= 3) {
                w.put(0, 8), w.put(1, 1), w.put(n, 7), w.put(code, 8);
            } else {
                n = 1;
                w.put(code, 8);
            }
            count -= n;
        }
    }
}

// The lines of one field of a region, from `row` on, every other line.
void encodeField(std::vector<uint8_t>& out, const Region& r, int row) {
    const int bits = depthBits(r.depth);
    const uint32_t mask = (1u << bits) - 1;
    for (int y = row; y < r.height; y += 2) {
        out.push_back(bits == 2 ? 0x10 : bits == 4 ? 0x11 : 0x12);
        BitWriter w(out);
        const uint8_t* line = r.pixels.data() + static_cast<size_t>(y) * r.width;
        // ffmpeg's 8-bit string reader stops at a full line before the string's end code and
        // then rejects the rest of the object: the last pixel of an 8-bit line goes as a 2-bit
        // string through the 2-to-8 map table, which every decoder reads alike.
        const int last = bits == 8 ? std::max(r.width - 1, 0) : r.width;  // width 0: no pixel
        for (int x = 0; x < last;) {
            uint32_t code = line[x] & mask;
            int end = x + 1;
            while (end < last && (line[end] & mask) == code) ++end;
            encodeRun(w, bits, code, end - x);
            x = end;
        }
        w.put(0, bits == 2 ? 6 : bits == 4 ? 8 : 16);  // end of string
        w.align();
        if (last < r.width) {
            out.insert(out.end(), {0x21, 0x00, line[last], 0x00, 0x00, 0x10, 0x40});
        }
        out.push_back(0xF0);
    }
}

void encodeClut(std::vector<uint8_t>& out, uint8_t flag, uint8_t entry, const ClutEntry& e) {
    if ((e.y & 3) == 0 && (e.cr & 15) == 0 && (e.cb & 15) == 0 && (e.t & 63) == 0) {
        out.insert(out.end(),
                   {entry, flag, static_cast<uint8_t>(e.y | e.cr >> 6),
                    static_cast<uint8_t>((e.cr >> 4 & 3) << 6 | (e.cb >> 4) << 2 | e.t >> 6)});
    } else {
        out.insert(out.end(), {entry, static_cast<uint8_t>(flag | 1), e.y, e.cr, e.cb, e.t});
    }
}

bool same(const ClutEntry& a, const ClutEntry& b) {
    return a.y == b.y && a.cr == b.cr && a.cb == b.cb && a.t == b.t;
}

}  // namespace

std::vector<uint8_t> encodeDisplaySet(const DisplaySet& set, uint16_t pageId, uint64_t pts) {
    std::vector<uint8_t> out = {0x00, 0x00, 0x01, 0xBD, 0, 0, 0x84, 0x80,
                                5,    0,    0,    0,    0, 0, 0x20, 0x00};
    writePts(out.data() + 9, pts);
    bool fits = true;
    size_t at;
    if (set.hasDisplay) {
        at = openSegment(out, kDisplayDefinition, pageId);
        out.push_back(static_cast<uint8_t>(set.displayVersion << 4 | (set.windowed ? 8 : 0)));
        put16(out, set.displayWidth - 1u);
        put16(out, set.displayHeight - 1u);
        if (set.windowed) {
            for (uint16_t v : {set.windowX, set.windowMaxX, set.windowY, set.windowMaxY}) {
                put16(out, v);
            }
        }
        fits &= closeSegment(out, at);
    }
    at = openSegment(out, kPageComposition, pageId);
    out.push_back(set.timeout);
    out.push_back(static_cast<uint8_t>((set.version & 15) << 4 | (set.state & 3) << 2));
    for (const RegionRef& placed : set.placements) {
        out.insert(out.end(), {placed.id, 0});
        put16(out, placed.x);
        put16(out, placed.y);
    }
    fits &= closeSegment(out, at);

    // The id of the object that carries each region's pixels.
    std::vector<uint16_t> carriers;
    for (const Region& r : set.regions) {
        uint16_t id = static_cast<uint16_t>(0xFF00 | r.id);
        while (std::find(carriers.begin(), carriers.end(), id) != carriers.end()) ++id;
        for (const ObjectRef& o : r.objects) {
            if (o.type == 0 && o.x == 0 && o.y == 0 &&
                std::find(carriers.begin(), carriers.end(), o.id) == carriers.end()) {
                id = o.id;
                break;
            }
        }
        carriers.push_back(id);
    }
    for (size_t k = 0; k < set.regions.size(); ++k) {
        const Region& r = set.regions[k];
        at = openSegment(out, kRegionComposition, pageId);
        out.push_back(r.id);
        out.push_back(static_cast<uint8_t>((r.version & 15) << 4 | (r.fill ? 8 : 0)));
        put16(out, r.width);
        put16(out, r.height);
        out.push_back(static_cast<uint8_t>((r.levelOfCompatibility & 7) << 5 | (r.depth & 7) << 2));
        out.push_back(r.clutId);
        out.push_back(r.background8);
        out.push_back(static_cast<uint8_t>((r.background4 & 15) << 4 | (r.background2 & 3) << 2));
        if (depthBits(r.depth) != 0 && r.pixels.size() == size_t{r.width} * r.height) {
            put16(out, carriers[k]);
            out.insert(out.end(), {0, 0, 0xF0, 0});  // bitmap, at (0, 0)
        }
        fits &= closeSegment(out, at);
    }
    const Clut& standard = defaultClut();
    for (const Clut& c : set.cluts) {
        at = openSegment(out, kClutDefinition, pageId);
        out.push_back(c.id);
        out.push_back(static_cast<uint8_t>((c.version & 15) << 4));
        // The tables that regions use go whole, so that no decoder falls back on its own idea
        // of the default entries; of the others, what differs from the default.
        auto used = [&set, &c](uint8_t depth) {
            return std::any_of(set.regions.begin(), set.regions.end(), [&](const Region& r) {
                return r.clutId == c.id && r.depth == depth;
            });
        };
        const ClutEntry* tables[3] = {c.c2.data(), c.c4.data(), c.c8.data()};
        const ClutEntry* defaults[3] = {standard.c2.data(), standard.c4.data(), standard.c8.data()};
        for (int t = 0; t < 3; ++t) {
            bool whole = used(static_cast<uint8_t>(t + 1));
            for (size_t i = 0; i < (t == 0 ? 4u : t == 1 ? 16u : 256u); ++i) {
                if (whole || !same(tables[t][i], defaults[t][i])) {
                    encodeClut(out, static_cast<uint8_t>(0x80 >> t), static_cast<uint8_t>(i),
                               tables[t][i]);
                }
            }
        }
        fits &= closeSegment(out, at);
    }
    for (size_t k = 0; k < set.regions.size(); ++k) {
        const Region& r = set.regions[k];
        if (depthBits(r.depth) == 0 || r.pixels.size() != size_t{r.width} * r.height) continue;
        at = openSegment(out, kObjectData, pageId);
        put16(out, carriers[k]);
        out.push_back(0);  // version 0, pixels, no non-modifying colour
        size_t lengths = out.size();
        out.insert(out.end(), {0, 0, 0, 0});
        encodeField(out, r, 0);
        size_t top = out.size() - lengths - 4;
        // A region of one line has no bottom field of its own: it repeats the top one.
        if (r.height > 1) encodeField(out, r, 1);
        size_t bottom = out.size() - lengths - 4 - top;
        fits &= top <= 0xFFFF && bottom <= 0xFFFF;
        out[lengths] = static_cast<uint8_t>(top >> 8);
        out[lengths + 1] = static_cast<uint8_t>(top);
        out[lengths + 2] = static_cast<uint8_t>(bottom >> 8);
        out[lengths + 3] = static_cast<uint8_t>(bottom);
        fits &= closeSegment(out, at);
    }
    at = openSegment(out, kEndOfDisplaySet, pageId);
    closeSegment(out, at);
    out.push_back(0xFF);
    size_t length = out.size() - 6;
    if (!fits || length > 0xFFFF) return {};
    out[4] = static_cast<uint8_t>(length >> 8);
    out[5] = static_cast<uint8_t>(length);
    return out;
}

}  // namespace dvbmodel
