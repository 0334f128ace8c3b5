// A level-1 teletext page as a viewer shows it: each of the 25 x 40 cells as a Unicode
// character with its colours and attributes, decoded from the page's bytes as transmitted
// (EN 300 706 level 1: the Latin G0 set with the page's national option subset, the G1 block
// mosaics, and the spacing attributes with their set-at and set-after rules).
#pragma once

#include <array>
#include <cstdint>
#include <string>

#include <Record.h>

namespace dvbrx {

// Colours of the level-1 palette.
enum TeletextColour : uint8_t {
    kTtxBlack = 0,
    kTtxRed = 1,
    kTtxGreen = 2,
    kTtxYellow = 3,
    kTtxBlue = 4,
    kTtxMagenta = 5,
    kTtxCyan = 6,
    kTtxWhite = 7,
};

// Attributes of a cell.
enum TeletextCellFlag : uint16_t {
    kCellFlash = 0x01,
    kCellConceal = 0x02,
    kCellBoxed = 0x04,
    kCellDoubleHeight = 0x08,  // the upper half of a double-height character
    kCellLowerHalf = 0x10,     // the row under a double-height row: the lower halves
    kCellMosaic = 0x20,        // a block mosaic of the G1 set
    kCellSeparated = 0x40,     // a mosaic drawn separated
};

struct TeletextCell {
    char32_t ch = U' ';
    uint8_t foreground = kTtxWhite;
    uint8_t background = kTtxBlack;
    uint16_t flags = 0;
};

using TeletextRows = std::array<std::array<uint8_t, 40>, 25>;
using TeletextCells = std::array<std::array<TeletextCell, 40>, 25>;

// The character of G0 code `code` (0x20..0x7F) with national option subset `option` (the
// page's C12..C14 as 0..7: English, German, Swedish/Finnish/Hungarian, Italian, French,
// Portuguese/Spanish, Czech/Slovak; 7 shows the English subset).
char32_t teletextG0(uint8_t code, int option);
// The block mosaic of G1 code `code` (0x20..0x3F, 0x60..0x7F) as a Unicode block sextant
// (U+1FB00 block; space, U+258C, U+2590 and U+2588 for the four that Unicode has elsewhere).
char32_t teletextMosaic(uint8_t code);

// Decodes `rows` (7-bit bytes, parity removed) at level 1. A row holding a double-height
// character hides the row under it, which shows the lower halves instead; double height takes
// effect on rows 1 to 22 only.
TeletextCells renderTeletext(const TeletextRows& rows, int option);

// The text of a page as libzvbi prints it at level 1.5, 25 rows of 40 characters in UTF-8, for
// logs, the demo and comparisons with libzvbi: spacing attributes and block mosaics as spaces,
// 0x00 and 0x10 switching to alphanumerics and mosaics as they do from level 1.5 on, and the
// row under a row with double height a copy of it.
std::array<std::string, 25> teletextText(const TeletextRows& rows, int option);

// The page image that Teltxt::GetData delivers, little-endian (README "Teletext data").
struct TeltxtCellRecord {
    uint32_t ch;  // Unicode
    uint8_t foreground, background;
    uint16_t flags;  // TeletextCellFlag
};
DVB_RECORD_SIZE(TeltxtCellRecord, 8);

enum TeltxtStatus : uint8_t { kTtxWaiting = 0, kTtxShown = 1 };

struct TeltxtImage {
    uint16_t page;         // selected, 0x100..0x8FF
    uint16_t subcode;      // of the sending shown
    uint16_t controlBits;  // C4..C14 as bits 4..14
    uint8_t nationalOption;
    uint8_t status;     // TeltxtStatus
    uint32_t time;      // UTC seconds of the receiver's clock, as the header's clock shows it
    uint16_t subpages;  // distinct subcodes of the page in the broadcast
    uint16_t subpageSelected;
    uint8_t reserved16[16];
    TeltxtCellRecord cells[25][40];
};
DVB_RECORD_SIZE(TeltxtImage, 8032);
DVB_RECORD_FIELD(TeltxtImage, subcode, 2);
DVB_RECORD_FIELD(TeltxtImage, controlBits, 4);
DVB_RECORD_FIELD(TeltxtImage, nationalOption, 6);
DVB_RECORD_FIELD(TeltxtImage, status, 7);
DVB_RECORD_FIELD(TeltxtImage, time, 8);
DVB_RECORD_FIELD(TeltxtImage, subpages, 12);
DVB_RECORD_FIELD(TeltxtImage, subpageSelected, 14);
DVB_RECORD_FIELD(TeltxtImage, cells, 32);

}  // namespace dvbrx
