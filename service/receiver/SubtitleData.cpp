#include "SubtitleData.h"

#include <algorithm>
#include <cstring>

namespace dvbrx {
namespace {

// Rounds num / den (den > 0) to the nearest integer, halves away from zero.
int roundDiv(int64_t num, int64_t den) {
    return static_cast<int>(num >= 0 ? (num + den / 2) / den : -((-num + den / 2) / den));
}

// A colour level given in sixths of full scale (the standard's 100 %, 66.7 %, 50 %, 33.3 %
// and 16.7 % are 6, 4, 3, 2 and 1 sixths), as 0..255.
int level(int sixths) {
    return roundDiv(sixths * 255, 6);
}

constexpr SUBTTL_ClutEntry kTransparent{0, 128, 128, 255};

// Entry `i` of a default table from its levels in sixths and its transparency in percent.
SUBTTL_ClutEntry entry(int r, int g, int b, int transparency) {
    return yccOf(level(r), level(g), level(b), roundDiv(transparency * 255, 100));
}

SUBTTL_Clut makeDefaultClut() {
    SUBTTL_Clut c{};
    // 2 bit: transparent, white, black, 50 % grey.
    c.c_2b[0] = kTransparent;
    c.c_2b[1] = entry(6, 6, 6, 0);
    c.c_2b[2] = entry(0, 0, 0, 0);
    c.c_2b[3] = entry(3, 3, 3, 0);
    // 4 bit, entry bits b1 b2 b3 b4 (b1 the highest): b4 red, b3 green, b2 blue, at full level
    // when b1 is 0 and at half level when it is 1.
    for (int i = 0; i < 16; ++i) {
        const int full = (i & 8) != 0 ? 3 : 6;
        c.c_4b[i] = i == 0 ? kTransparent
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
            if (!b1) {
                rgb[k] = lo[k] * 2 + hi[k] * 4;  // 33.3 % and 66.7 %
            } else {
                rgb[k] = lo[k] + hi[k] * 2 + (b5 ? 0 : 3);  // 16.7 % and 33.3 %, + 50 %
            }
        }
        if (!b1 && !b5) {
            if (i == 0) {
                c.c_8b[i] = kTransparent;
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
        c.c_8b[i] = entry(rgb[0], rgb[1], rgb[2], transparency);
    }
    return c;
}

}  // namespace

SUBTTL_ClutEntry yccOf(int r, int g, int b, int t) {
    const int y = 16 + roundDiv(65481LL * r + 128553LL * g + 24966LL * b, 255000);
    const int cb = 128 + roundDiv(-37797LL * r - 74203LL * g + 112000LL * b, 255000);
    const int cr = 128 + roundDiv(112000LL * r - 93786LL * g - 18214LL * b, 255000);
    return {static_cast<uint8_t>(y), static_cast<uint8_t>(cr), static_cast<uint8_t>(cb),
            static_cast<uint8_t>(t)};
}

const SUBTTL_Clut& defaultClut() {
    static const SUBTTL_Clut clut = makeDefaultClut();
    return clut;
}

void fillSubtitleData(const dvbmodel::DisplaySet& set, uint32_t pts, SUBTTL_Data* data) {
    data->i_pts = static_cast<int32_t>(pts);
    data->numPage = 1;
    SUBTTL_Page_t& page = data->page[0];
    page.i_id = set.pageId;
    page.i_timeout = set.timeout;
    page.i_state = set.state;
    page.i_version = set.version;
    const size_t placements = std::min<size_t>(set.placements.size(), kSubttlRegionDefs);
    page.i_region_defs = static_cast<int32_t>(placements);
    for (size_t d = 0; d < placements; ++d) {
        page.region_defs[d] = {set.placements[d].id, set.placements[d].x, set.placements[d].y};
    }

    const size_t regions = std::min<size_t>(set.regions.size(), kSubttlRegions);
    data->numRegions = static_cast<int32_t>(regions);
    for (size_t r = 0; r < regions; ++r) {
        const dvbmodel::Region& from = set.regions[r];
        SUBTTL_Region_t& to = data->regions[r];
        to.i_id = from.id;
        to.i_version = from.version;
        // A region sits where the page places it; one the page does not place has no position.
        to.i_x = to.i_y = 0;
        for (const auto& p : set.placements) {
            if (p.id != from.id) continue;
            to.i_x = p.x;
            to.i_y = p.y;
            break;
        }
        int32_t width = from.width, height = from.height;
        if (width > 0) height = std::min(height, kSubttlRegionPixels / width);
        to.i_width = width;
        to.i_height = height;
        to.i_level_comp = from.levelOfCompatibility;
        to.i_depth = from.depth;
        to.i_clut = from.clutId;
        const size_t pixels = static_cast<size_t>(width) * static_cast<size_t>(height);
        const size_t carried = std::min(pixels, from.pixels.size());
        if (carried > 0) memcpy(to.p_pixbuf, from.pixels.data(), carried);
        // Pixels the model lacks show the region's background, index 0.
        memset(to.p_pixbuf + carried, 0, pixels - carried);
        const size_t objects = std::min<size_t>(from.objects.size(), kSubttlObjectDefs);
        to.i_object_defs = static_cast<int32_t>(objects);
        for (size_t o = 0; o < objects; ++o) {
            const dvbmodel::ObjectRef& ref = from.objects[o];
            to.object_defs[o] = SUBTTL_ObjectDef{ref.id,         ref.type,       ref.x, ref.y,
                                                 ref.foreground, ref.background, {},    0};
        }
    }

    const size_t cluts = std::min<size_t>(set.cluts.size(), kSubttlCluts);
    data->numCluts = static_cast<int32_t>(cluts);
    for (size_t c = 0; c < cluts; ++c) {
        const dvbmodel::Clut& from = set.cluts[c];
        SUBTTL_Clut& to = data->cluts[c];
        to.i_id = from.id;
        to.i_version = from.version;
        auto copy = [](const auto& entries, SUBTTL_ClutEntry* out) {
            for (const dvbmodel::ClutEntry& e : entries) *out++ = {e.y, e.cr, e.cb, e.t};
        };
        copy(from.c2, to.c_2b);
        copy(from.c4, to.c_4b);
        copy(from.c8, to.c_8b);
    }

    SUBTTL_Display& display = data->display;
    display = SUBTTL_Display{};
    display.i_width = 720;
    display.i_height = 576;
    if (set.hasDisplay) {
        display.i_id = 1;
        display.i_version = set.displayVersion;
        display.i_width = set.displayWidth;
        display.i_height = set.displayHeight;
        display.b_windowed = set.windowed ? 1 : 0;
        if (set.windowed) {
            display.i_x = set.windowX;
            display.i_y = set.windowY;
            display.i_max_x = set.windowMaxX;
            display.i_max_y = set.windowMaxY;
        }
    }
    data->defaultClut = defaultClut();
}

}  // namespace dvbrx
