#include "Teletext.h"

#include "broadcast/Broadcast.h"

namespace dvbrx {
namespace {

// The thirteen G0 positions that a national option subset replaces, in the order of the
// subset table below.
constexpr uint8_t kNationalPositions[13] = {0x23, 0x24, 0x40, 0x5B, 0x5C, 0x5D, 0x5E,
                                            0x5F, 0x60, 0x7B, 0x7C, 0x7D, 0x7E};

constexpr char32_t kNationalSubsets[7][13] = {
        // English
        {U'£', U'$', U'@', U'←', U'½', U'→', U'↑', U'#', U'—', U'¼', U'‖', U'¾', U'÷'},
        // German
        {U'#', U'$', U'§', U'Ä', U'Ö', U'Ü', U'^', U'_', U'°', U'ä', U'ö', U'ü', U'ß'},
        // Swedish, Finnish, Hungarian
        {U'#', U'¤', U'É', U'Ä', U'Ö', U'Å', U'Ü', U'_', U'é', U'ä', U'ö', U'å', U'ü'},
        // Italian
        {U'£', U'$', U'é', U'°', U'ç', U'→', U'↑', U'#', U'ù', U'à', U'ò', U'è', U'ì'},
        // French
        {U'é', U'ï', U'à', U'ë', U'ê', U'ù', U'î', U'#', U'è', U'â', U'ô', U'û', U'ç'},
        // Portuguese, Spanish
        {U'ç', U'$', U'¡', U'á', U'é', U'í', U'ó', U'ú', U'¿', U'ü', U'ñ', U'è', U'à'},
        // Czech, Slovak
        {U'#', U'ů', U'č', U'ť', U'ž', U'ý', U'í', U'ř', U'é', U'á', U'ě', U'ú', U'š'},
};

using namespace dvbmodel::ttx;

// What the attributes of a row have set so far, from the defaults at its start.
struct RowState {
    uint8_t foreground = kTtxWhite, background = kTtxBlack;
    bool mosaic = false, separated = false, hold = false;
    bool flash = false, conceal = false, boxed = false, doubleHeight = false;
    // The last mosaic shown, for spacing attributes under hold; back to space at a change of
    // alphanumerics/mosaics or of size.
    char32_t held = U' ';
    bool heldSeparated = false;

    void dropHeld() {
        held = U' ';
        heldSeparated = false;
    }
};

TeletextCell decode(RowState& s, uint8_t code, int option, bool doubleHeightRow) {
    // Set-at attributes change the cell that carries them.
    switch (code) {
        case kSteady:
            s.flash = false;
            break;
        case kNormalSize:
            if (s.doubleHeight) s.dropHeld();
            s.doubleHeight = false;
            break;
        case kConceal:
            s.conceal = true;
            break;
        case kContiguous:
            s.separated = false;
            break;
        case kSeparated:
            s.separated = true;
            break;
        case kBlackBackground:
            s.background = kTtxBlack;
            break;
        case kNewBackground:
            s.background = s.foreground;
            break;
        case kHold:
            s.hold = true;
            break;
    }
    TeletextCell cell;
    cell.foreground = s.foreground;
    cell.background = s.background;
    cell.flags = (s.flash ? kCellFlash : 0) | (s.conceal ? kCellConceal : 0) |
                 (s.boxed ? kCellBoxed : 0) | (s.doubleHeight ? kCellDoubleHeight : 0);
    if (code >= 0x20) {
        // In mosaics mode, codes 0x40..0x5F still show their G0 characters.
        if (s.mosaic && (code & 0x20) != 0) {
            cell.ch = teletextMosaic(code);
            cell.flags |= kCellMosaic | (s.separated ? kCellSeparated : 0);
            s.held = cell.ch;
            s.heldSeparated = s.separated;
        } else {
            cell.ch = teletextG0(code, option);
        }
    } else if (s.hold && s.mosaic) {
        cell.ch = s.held;
        if (s.held != U' ') cell.flags |= kCellMosaic | (s.heldSeparated ? kCellSeparated : 0);
    }
    // Set-after attributes change the cells after them. Alpha black (0x00), mosaic black
    // (0x10), the size codes beyond double height and ESC belong to higher levels: level 1
    // shows them as spaces and changes nothing.
    if (code >= 0x01 && code <= 0x07) {
        s.foreground = code;
        s.conceal = false;
        if (s.mosaic) s.dropHeld();
        s.mosaic = false;
    } else if (code >= 0x11 && code <= 0x17) {
        s.foreground = code - 0x10;
        s.conceal = false;
        if (!s.mosaic) s.dropHeld();
        s.mosaic = true;
    } else if (code == kFlash) {
        s.flash = true;
    } else if (code == kEndBox) {
        s.boxed = false;
    } else if (code == kStartBox) {
        s.boxed = true;
    } else if (code == kDoubleHeight && doubleHeightRow) {
        if (!s.doubleHeight) s.dropHeld();
        s.doubleHeight = true;
    } else if (code == kRelease) {
        s.hold = false;
    }
    return cell;
}

}  // namespace

char32_t teletextG0(uint8_t code, int option) {
    code &= 0x7F;
    if (code < 0x20) return U' ';
    // The Latin G0 set shows a solid block at 0x7F.
    if (code == 0x7F) return U'■';
    const int subset = option >= 0 && option < 7 ? option : 0;
    for (int i = 0; i < 13; ++i) {
        if (kNationalPositions[i] == code) return kNationalSubsets[subset][i];
    }
    return code;
}

char32_t teletextMosaic(uint8_t code) {
    // Bits 0..4 and 6 of the code are the six cells, top left to bottom right.
    const int cells = (code & 0x1F) | (code & 0x40) >> 1;
    switch (cells) {
        case 0:
            return U' ';
        case 0x15:
            return U'▌';
        case 0x2A:
            return U'▐';
        case 0x3F:
            return U'█';
    }
    // Unicode's block sextants run through the other 60 in the cells' binary order.
    return 0x1FB00 + cells - 1 - (cells > 0x15 ? 1 : 0) - (cells > 0x2A ? 1 : 0);
}

TeletextCells renderTeletext(const TeletextRows& rows, int option) {
    TeletextCells image;
    for (int r = 0; r < 25; ++r) {
        RowState state;
        const bool doubleHeightRow = r >= 1 && r <= 22;
        bool anyDouble = false;
        for (int c = 0; c < 40; ++c) {
            image[r][c] = decode(state, rows[r][c] & 0x7F, option, doubleHeightRow);
            anyDouble |= (image[r][c].flags & kCellDoubleHeight) != 0;
        }
        if (!anyDouble) continue;
        // The row under it is not shown: it carries the lower halves, and elsewhere spaces in
        // the background above them.
        for (int c = 0; c < 40; ++c) {
            TeletextCell lower = image[r][c];
            if ((lower.flags & kCellDoubleHeight) != 0) {
                lower.flags = (lower.flags & ~kCellDoubleHeight) | kCellLowerHalf;
            } else {
                lower.ch = U' ';
                lower.flags &= kCellBoxed;
            }
            image[r + 1][c] = lower;
        }
        ++r;
    }
    return image;
}

std::array<std::string, 25> teletextText(const TeletextRows& rows, int option) {
    std::array<std::string, 25> text;
    for (int r = 0; r < 25; ++r) {
        bool mosaic = false, doubleHeight = false;
        for (uint8_t b : rows[r]) {
            b &= 0x7F;
            mosaic = b < 0x08 ? false : b >= 0x10 && b < 0x18 ? true : mosaic;
            doubleHeight |= b == kDoubleHeight;
            const char32_t u = b < 0x20 || (mosaic && (b & 0x20)) ? U' ' : teletextG0(b, option);
            if (u < 0x80) {
                text[r] += static_cast<char>(u);
            } else if (u < 0x800) {
                text[r] += {static_cast<char>(0xC0 | u >> 6), static_cast<char>(0x80 | (u & 0x3F))};
            } else {
                text[r] += {static_cast<char>(0xE0 | u >> 12),
                            static_cast<char>(0x80 | (u >> 6 & 0x3F)),
                            static_cast<char>(0x80 | (u & 0x3F))};
            }
        }
        // Double height takes effect on rows 1 to 22.
        if (doubleHeight && r >= 1 && r <= 22) {
            text[r + 1] = text[r];
            ++r;
        }
    }
    return text;
}

}  // namespace dvbrx
