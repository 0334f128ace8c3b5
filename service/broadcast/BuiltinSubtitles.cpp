// DVB subtitles of the built-in broadcast: the lines of subtitleCues rendered with FreeType
// into region pixel buffers, one region per line, centred near the bottom of a 720x576 page.
// Each line is shown for kCueShownMillis, then cleared by a display set without regions.
#include <ft2build.h>
#include FT_FREETYPE_H

#include <algorithm>
#include <memory>

#include "broadcast/BuiltinParts.h"

namespace dvbmodel::builtin {

namespace {

// From Debian's fonts-dejavu-core.
constexpr const char* kFontPath = "/usr/share/fonts/truetype/dejavu/DejaVuSans.ttf";
constexpr int kPixelSize = 30;
constexpr int kPadding = 10;       // box around the text, each side
constexpr int kBottomMargin = 40;  // between the last line and the bottom of the display
constexpr int kSideMargin = 20;
constexpr uint16_t kDisplayWidth = 720, kDisplayHeight = 576;

// Decodes the UTF-8 character at `i` and moves `i` past it; a byte that starts no valid
// sequence stands for itself.
char32_t nextChar(std::string_view s, size_t& i) {
    const auto lead = static_cast<unsigned char>(s[i++]);
    const int extra = lead >= 0xF0 ? 3 : lead >= 0xE0 ? 2 : lead >= 0xC0 ? 1 : 0;
    if (extra == 0 || i + extra > s.size()) return lead;
    char32_t c = lead & (0x3F >> extra);
    for (int k = 0; k < extra; ++k) {
        const auto b = static_cast<unsigned char>(s[i + k]);
        if ((b & 0xC0) != 0x80) return lead;
        c = (c << 6) | (b & 0x3F);
    }
    i += extra;
    return c;
}

class Renderer {
public:
    Renderer() {
        FT_Library library = nullptr;
        if (FT_Init_FreeType(&library) != 0) return;
        library_.reset(library);
        FT_Face face = nullptr;
        if (FT_New_Face(library, kFontPath, 0, &face) != 0) return;
        face_.reset(face);
        if (FT_Set_Pixel_Sizes(face, 0, kPixelSize) != 0) face_.reset();
    }
    explicit operator bool() const { return face_ != nullptr; }
    int ascender() const { return static_cast<int>(face_->size->metrics.ascender >> 6); }
    int lineHeight() const { return static_cast<int>(face_->size->metrics.height >> 6); }

    int measure(std::string_view text) {
        long advance = 0;
        for (size_t i = 0; i < text.size();) {
            if (FT_Load_Char(face_.get(), nextChar(text, i), FT_LOAD_DEFAULT) == 0)
                advance += face_->glyph->advance.x;
        }
        return static_cast<int>(advance >> 6);
    }

    // Glyph coverage (0..255) of `text` into a width x height buffer, pen starting at
    // (x, baseline); what falls outside the buffer is cut.
    void draw(std::string_view text, std::vector<uint8_t>& coverage, int width, int height, int x,
              int baseline) {
        long pen = static_cast<long>(x) << 6;
        for (size_t i = 0; i < text.size();) {
            if (FT_Load_Char(face_.get(), nextChar(text, i), FT_LOAD_RENDER) != 0) continue;
            const FT_GlyphSlot g = face_->glyph;
            const FT_Bitmap& bm = g->bitmap;
            const int left = static_cast<int>(pen >> 6) + g->bitmap_left;
            const int top = baseline - g->bitmap_top;
            for (int r = 0; r < static_cast<int>(bm.rows); ++r) {
                const int y = top + r;
                if (y < 0 || y >= height) continue;
                for (int c = 0; c < static_cast<int>(bm.width); ++c) {
                    const int px = left + c;
                    if (px < 0 || px >= width) continue;
                    uint8_t& dst = coverage[static_cast<size_t>(y) * width + px];
                    dst = std::max(dst, bm.buffer[r * bm.pitch + c]);
                }
            }
            pen += g->advance.x;
        }
    }

private:
    struct LibraryDone {
        void operator()(FT_Library l) const { FT_Done_FreeType(l); }
    };
    struct FaceDone {
        void operator()(FT_Face f) const { FT_Done_Face(f); }
    };
    // The face is released before the library.
    std::unique_ptr<FT_LibraryRec_, LibraryDone> library_;
    std::unique_ptr<FT_FaceRec_, FaceDone> face_;
};

struct Ycc {
    uint8_t y, cr, cb;
};
constexpr Ycc kWhite{235, 128, 128}, kYellow{210, 146, 16}, kBlack{16, 128, 128};
// Half transparent, so that the picture shows through the box.
constexpr uint8_t kBoxTransparency = 0x80;

// Entry k of n on the ramp from the box to the text colour.
ClutEntry ramp(Ycc text, int k, int n) {
    auto mix = [&](int box, int fg) { return static_cast<uint8_t>((box * (n - k) + fg * k) / n); };
    return {mix(kBlack.y, text.y), mix(kBlack.cr, text.cr), mix(kBlack.cb, text.cb),
            mix(kBoxTransparency, 0)};
}

// Every table: entry 0 transparent, entry 1 the box, then the ramp up to the text colour,
// so that a pixel's index is 1 + its glyph coverage scaled to the table.
template <size_t N>
void fill(std::array<ClutEntry, N>& table, Ycc text) {
    table[0] = {0, 128, 128, 0xFF};
    for (size_t k = 1; k < N; ++k) table[k] = ramp(text, static_cast<int>(k - 1), N - 2);
}

Clut makeClut(uint8_t id, Ycc text) {
    Clut c;
    c.id = id;
    fill(c.c2, text);
    fill(c.c4, text);
    fill(c.c8, text);
    return c;
}

// One region holding one line of text, in a depth given by its EN 300 743 code (1, 2, 3).
Region lineRegion(Renderer& renderer, std::string_view text, uint8_t id, uint8_t version,
                  uint8_t depth, uint8_t clutId) {
    Region r;
    r.id = id;
    r.version = version;
    r.depth = depth;
    r.levelOfCompatibility = depth;
    r.clutId = clutId;
    const int textWidth = renderer.measure(text);
    const int width = std::min(textWidth + 2 * kPadding, kDisplayWidth - 2 * kSideMargin);
    const int height = renderer.lineHeight() + kPadding;
    r.width = static_cast<uint16_t>(width);
    r.height = static_cast<uint16_t>(height);
    std::vector<uint8_t> coverage(static_cast<size_t>(width) * height, 0);
    renderer.draw(text, coverage, width, height, std::max(kPadding, (width - textWidth) / 2),
                  kPadding / 2 + renderer.ascender());
    const int top = (1 << (2 << (depth - 1))) - 2;  // the highest ramp step: 2, 14 or 254
    r.pixels.resize(coverage.size());
    std::transform(coverage.begin(), coverage.end(), r.pixels.begin(),
                   [top](uint8_t c) { return static_cast<uint8_t>(1 + (c * top + 127) / 255); });
    ObjectRef object;  // one bitmap object covering the region
    object.id = id;
    object.foreground = static_cast<uint8_t>(top + 1);
    object.background = 1;
    r.objects.push_back(object);
    return r;
}

DisplaySet emptySet(int64_t time, uint16_t pageId, uint8_t version) {
    DisplaySet d;
    d.time = time;
    d.pageId = pageId;
    d.version = version & 0x0F;
    d.hasDisplay = true;
    d.displayWidth = kDisplayWidth;
    d.displayHeight = kDisplayHeight;
    return d;
}

}  // namespace

std::vector<DisplaySet> subtitleLoop(Language language, uint16_t pageId) {
    std::vector<DisplaySet> sets;
    // Without the font there is nothing to show: the services keep their subtitle components
    // and a decoder started on them finds no display set.
    Renderer renderer;
    if (!renderer) return sets;
    const Cue* cues = subtitleCues(language);
    sets.reserve(2 * kCues);
    for (int i = 0; i < kCues; ++i) {
        const Cue& cue = cues[i];
        DisplaySet shown = emptySet(i * kCueMillis, pageId, static_cast<uint8_t>(2 * i));
        // The loop starts with a mode change; every later set is complete on its own.
        shown.state = i == 0 ? 2 : 1;
        shown.timeout = static_cast<uint8_t>((kCueShownMillis + 999) / 1000 + 1);
        // The depths take turns: 2, 4 and 8 bits per pixel.
        const auto depth = static_cast<uint8_t>(1 + i % 3);
        const uint8_t clutId = cue.otherSpeaker ? 2 : 1;
        shown.cluts.push_back(makeClut(clutId, cue.otherSpeaker ? kYellow : kWhite));
        const bool twoLines = cue.second[0] != '\0';
        shown.regions.push_back(lineRegion(renderer, cue.first, 1, i & 0x0F, depth, clutId));
        if (twoLines)
            shown.regions.push_back(lineRegion(renderer, cue.second, 2, i & 0x0F, depth, clutId));
        int y = kDisplayHeight - kBottomMargin;
        for (auto r = shown.regions.rbegin(); r != shown.regions.rend(); ++r) y -= r->height;
        for (const Region& r : shown.regions) {
            shown.placements.push_back({r.id, static_cast<uint16_t>((kDisplayWidth - r.width) / 2),
                                        static_cast<uint16_t>(y)});
            y += r.height;
        }
        sets.push_back(std::move(shown));
        sets.push_back(emptySet(i * kCueMillis + kCueShownMillis, pageId,
                                static_cast<uint8_t>(2 * i + 1)));
    }
    return sets;
}

}  // namespace dvbmodel::builtin
