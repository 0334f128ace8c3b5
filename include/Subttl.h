// Subtitle module of the DVB service: DVB subtitle decoding and its display data.
#pragma once

#include <utils/RefBase.h>

#include "Record.h"

struct SUBTTL_Settings {
    uint32_t devId;
    uint16_t pid;
    uint8_t type;
    char langCode[4];  // ISO 639 code, zero-padded
    uint8_t magazineNumber;
    uint8_t pageNumber;
    uint8_t reserved13;
    uint16_t compositionPageId;
    uint16_t ancillaryPageId;
    uint16_t pidCopy;  // the PID again
    uint32_t hstrm;    // stream handle
};
DVB_RECORD_SIZE(SUBTTL_Settings, 24);
DVB_RECORD_FIELD(SUBTTL_Settings, devId, 0);
DVB_RECORD_FIELD(SUBTTL_Settings, pid, 4);
DVB_RECORD_FIELD(SUBTTL_Settings, type, 6);
DVB_RECORD_FIELD(SUBTTL_Settings, langCode, 7);
DVB_RECORD_FIELD(SUBTTL_Settings, magazineNumber, 11);
DVB_RECORD_FIELD(SUBTTL_Settings, pageNumber, 12);
DVB_RECORD_FIELD(SUBTTL_Settings, compositionPageId, 14);
DVB_RECORD_FIELD(SUBTTL_Settings, ancillaryPageId, 16);
DVB_RECORD_FIELD(SUBTTL_Settings, pidCopy, 18);
DVB_RECORD_FIELD(SUBTTL_Settings, hstrm, 20);

// Room of the display-data buffer.
constexpr int kSubttlPages = 1;
constexpr int kSubttlRegionDefs = 16;
constexpr int kSubttlRegions = 5;
constexpr int kSubttlRegionPixels = 384000;
constexpr int kSubttlObjectDefs = 16;
constexpr int kSubttlCluts = 4;

struct SUBTTL_RegionDef {
    int32_t i_id;
    int32_t i_x;
    int32_t i_y;
};
DVB_RECORD_SIZE(SUBTTL_RegionDef, 12);
DVB_RECORD_FIELD(SUBTTL_RegionDef, i_id, 0);
DVB_RECORD_FIELD(SUBTTL_RegionDef, i_x, 4);
DVB_RECORD_FIELD(SUBTTL_RegionDef, i_y, 8);

struct SUBTTL_Page_t {
    int32_t i_id;
    int32_t i_timeout;
    int32_t i_state;
    int32_t i_version;
    int32_t i_region_defs;
    SUBTTL_RegionDef region_defs[kSubttlRegionDefs];
};
DVB_RECORD_SIZE(SUBTTL_Page_t, 212);
DVB_RECORD_FIELD(SUBTTL_Page_t, i_id, 0);
DVB_RECORD_FIELD(SUBTTL_Page_t, i_timeout, 4);
DVB_RECORD_FIELD(SUBTTL_Page_t, i_state, 8);
DVB_RECORD_FIELD(SUBTTL_Page_t, i_version, 12);
DVB_RECORD_FIELD(SUBTTL_Page_t, i_region_defs, 16);
DVB_RECORD_FIELD(SUBTTL_Page_t, region_defs, 20);

struct SUBTTL_ObjectDef {
    int32_t i_id;
    int32_t i_type;
    int32_t i_x;
    int32_t i_y;
    int32_t i_fg_pc;
    int32_t i_bg_pc;
    char psz_text[32];
    int32_t i_text_length;
};
DVB_RECORD_SIZE(SUBTTL_ObjectDef, 60);
DVB_RECORD_FIELD(SUBTTL_ObjectDef, i_id, 0);
DVB_RECORD_FIELD(SUBTTL_ObjectDef, i_type, 4);
DVB_RECORD_FIELD(SUBTTL_ObjectDef, i_x, 8);
DVB_RECORD_FIELD(SUBTTL_ObjectDef, i_y, 12);
DVB_RECORD_FIELD(SUBTTL_ObjectDef, i_fg_pc, 16);
DVB_RECORD_FIELD(SUBTTL_ObjectDef, i_bg_pc, 20);
DVB_RECORD_FIELD(SUBTTL_ObjectDef, psz_text, 24);
DVB_RECORD_FIELD(SUBTTL_ObjectDef, i_text_length, 56);

struct SUBTTL_Region_t {
    int32_t i_id;
    int32_t i_version;
    int32_t i_x;
    int32_t i_y;
    int32_t i_width;
    int32_t i_height;
    int32_t i_level_comp;
    int32_t i_depth;
    int32_t i_clut;
    uint8_t p_pixbuf[kSubttlRegionPixels];  // one CLUT index per pixel, row by row
    int32_t i_object_defs;
    SUBTTL_ObjectDef object_defs[kSubttlObjectDefs];
};
DVB_RECORD_SIZE(SUBTTL_Region_t, 385000);
DVB_RECORD_FIELD(SUBTTL_Region_t, i_id, 0);
DVB_RECORD_FIELD(SUBTTL_Region_t, i_version, 4);
DVB_RECORD_FIELD(SUBTTL_Region_t, i_x, 8);
DVB_RECORD_FIELD(SUBTTL_Region_t, i_y, 12);
DVB_RECORD_FIELD(SUBTTL_Region_t, i_width, 16);
DVB_RECORD_FIELD(SUBTTL_Region_t, i_height, 20);
DVB_RECORD_FIELD(SUBTTL_Region_t, i_level_comp, 24);
DVB_RECORD_FIELD(SUBTTL_Region_t, i_depth, 28);
DVB_RECORD_FIELD(SUBTTL_Region_t, i_clut, 32);
DVB_RECORD_FIELD(SUBTTL_Region_t, p_pixbuf, 36);
DVB_RECORD_FIELD(SUBTTL_Region_t, i_object_defs, 384036);
DVB_RECORD_FIELD(SUBTTL_Region_t, object_defs, 384040);

struct SUBTTL_Display {
    uint8_t i_id;
    uint8_t i_version;
    uint8_t reserved2[2];
    int32_t i_width;
    int32_t i_height;
    uint8_t b_windowed;
    uint8_t reserved13[3];
    int32_t i_x;
    int32_t i_y;
    int32_t i_max_x;
    int32_t i_max_y;
};
DVB_RECORD_SIZE(SUBTTL_Display, 32);
DVB_RECORD_FIELD(SUBTTL_Display, i_id, 0);
DVB_RECORD_FIELD(SUBTTL_Display, i_version, 1);
DVB_RECORD_FIELD(SUBTTL_Display, i_width, 4);
DVB_RECORD_FIELD(SUBTTL_Display, i_height, 8);
DVB_RECORD_FIELD(SUBTTL_Display, b_windowed, 12);
DVB_RECORD_FIELD(SUBTTL_Display, i_x, 16);
DVB_RECORD_FIELD(SUBTTL_Display, i_y, 20);
DVB_RECORD_FIELD(SUBTTL_Display, i_max_x, 24);
DVB_RECORD_FIELD(SUBTTL_Display, i_max_y, 28);

// One colour of a CLUT: luminance, colour differences and transparency (0 opaque).
struct SUBTTL_ClutEntry {
    uint8_t y;
    uint8_t cr;
    uint8_t cb;
    uint8_t t;
};
DVB_RECORD_SIZE(SUBTTL_ClutEntry, 4);
DVB_RECORD_FIELD(SUBTTL_ClutEntry, y, 0);
DVB_RECORD_FIELD(SUBTTL_ClutEntry, cr, 1);
DVB_RECORD_FIELD(SUBTTL_ClutEntry, cb, 2);
DVB_RECORD_FIELD(SUBTTL_ClutEntry, t, 3);

struct SUBTTL_Clut {
    uint8_t i_id;
    uint8_t i_version;
    SUBTTL_ClutEntry c_2b[4];
    SUBTTL_ClutEntry c_4b[16];
    SUBTTL_ClutEntry c_8b[256];
};
DVB_RECORD_SIZE(SUBTTL_Clut, 1106);
DVB_RECORD_FIELD(SUBTTL_Clut, i_id, 0);
DVB_RECORD_FIELD(SUBTTL_Clut, i_version, 1);
DVB_RECORD_FIELD(SUBTTL_Clut, c_2b, 2);
DVB_RECORD_FIELD(SUBTTL_Clut, c_4b, 18);
DVB_RECORD_FIELD(SUBTTL_Clut, c_8b, 82);

// The decoder's output for one display set: the layout of the exported buffer `Data`, which
// Subttl::GetData fills.
struct SUBTTL_Data {
    int32_t i_pts;
    int32_t numPage;
    SUBTTL_Page_t page[kSubttlPages];
    int32_t numRegions;
    SUBTTL_Region_t regions[kSubttlRegions];
    int32_t numCluts;
    SUBTTL_Clut cluts[kSubttlCluts];
    SUBTTL_Display display;
    SUBTTL_Clut defaultClut;
    uint8_t reserved1930790[2];
};
DVB_RECORD_SIZE(SUBTTL_Data, 1930792);
DVB_RECORD_FIELD(SUBTTL_Data, i_pts, 0);
DVB_RECORD_FIELD(SUBTTL_Data, numPage, 4);
DVB_RECORD_FIELD(SUBTTL_Data, page, 8);
DVB_RECORD_FIELD(SUBTTL_Data, numRegions, 220);
DVB_RECORD_FIELD(SUBTTL_Data, regions, 224);
DVB_RECORD_FIELD(SUBTTL_Data, numCluts, 1925224);
DVB_RECORD_FIELD(SUBTTL_Data, cluts, 1925228);
DVB_RECORD_FIELD(SUBTTL_Data, display, 1929652);
DVB_RECORD_FIELD(SUBTTL_Data, defaultClut, 1929684);
DVB_RECORD_FIELD(SUBTTL_Data, reserved1930790, 1930790);

namespace android {

class Subttl : public RefBase {
public:
    virtual int32_t Init() = 0;
    virtual int32_t Start(const SUBTTL_Settings* settings) = 0;
    virtual int32_t Stop(int32_t handle) = 0;
    // Writes the current display set into `data`, laid out as SUBTTL_Data.
    virtual int32_t GetData(int32_t handle, void* data) = 0;
};

}  // namespace android
