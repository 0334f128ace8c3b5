#include "SubtitleData.h"

#include "../broadcast/DvbSubtitle.h"

#include <algorithm>
#include <cstring>

namespace dvbrx {
namespace {

void copyClut(const dvbmodel::Clut& from, SUBTTL_Clut& to) {
    to.i_id = from.id;
    to.i_version = from.version;
    auto copy = [](const auto& entries, SUBTTL_ClutEntry* out) {
        for (const dvbmodel::ClutEntry& e : entries) *out++ = {e.y, e.cr, e.cb, e.t};
    };
    copy(from.c2, to.c_2b);
    copy(from.c4, to.c_4b);
    copy(from.c8, to.c_8b);
}

}  // namespace

const SUBTTL_Clut& defaultClut() {
    static const SUBTTL_Clut clut = [] {
        SUBTTL_Clut c{};
        copyClut(dvbmodel::defaultClut(), c);
        return c;
    }();
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
            SUBTTL_ObjectDef& def = to.object_defs[o];
            def = SUBTTL_ObjectDef{ref.id,         ref.type,       ref.x, ref.y,
                                   ref.foreground, ref.background, {},    0};
            // A character object's codes, two bytes each as broadcast (high byte first): the
            // first 16 fit.
            const size_t chars = std::min<size_t>(ref.text.size(), sizeof def.psz_text / 2);
            for (size_t i = 0; i < chars; ++i) {
                def.psz_text[2 * i] = static_cast<char>(ref.text[i] >> 8);
                def.psz_text[2 * i + 1] = static_cast<char>(ref.text[i]);
            }
            def.i_text_length = static_cast<int32_t>(chars);
        }
    }

    const size_t cluts = std::min<size_t>(set.cluts.size(), kSubttlCluts);
    data->numCluts = static_cast<int32_t>(cluts);
    for (size_t c = 0; c < cluts; ++c) {
        copyClut(set.cluts[c], data->cluts[c]);
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
