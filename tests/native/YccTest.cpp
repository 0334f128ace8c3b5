#include <gtest/gtest.h>

#include <cstdint>

#include "Ycc.h"

namespace {

// The conversion written from the centred BT.601 form, in 64 bits, with C's own truncating
// division: independent of the folded constants and the limiting order of the library.
int reference(int64_t scaled) {
    int64_t q = scaled / 1000;
    return q < 0 ? 0 : q > 255 ? 255 : static_cast<int>(q);
}
int refR(int y, int cr, int) {
    return y == 0 ? 0 : reference(1164 * (y - 16) + 1596 * (cr - 128));
}
int refG(int y, int cr, int cb) {
    return y == 0 ? 0 : reference(1164 * (y - 16) - 813 * (cr - 128) - 392 * (cb - 128));
}
int refB(int y, int, int cb) {
    return y == 0 ? 0 : reference(1164 * (y - 16) + 2017 * (cb - 128));
}

uint32_t argb(int y, int cr, int cb, int t) {
    return static_cast<uint32_t>(YCC2RGB_A(y, t)) << 24 | YCC2RGB_R(y, cr, cb) << 16 |
           YCC2RGB_G(y, cr, cb) << 8 | YCC2RGB_B(y, cr, cb);
}

struct Worked {
    int y, cr, cb, t;
    uint32_t colour;
};

TEST(Ycc, WorkedValues) {
    const Worked cases[] = {
            {235, 128, 128, 0, 0xFFFEFEFE},
            {16, 128, 128, 0, 0xFF000000},
            {126, 128, 128, 127, 0x80808080},
            {81, 240, 90, 0, 0xFFFE0000},
            {145, 34, 54, 0, 0xFF00FF00},
            {41, 110, 240, 0, 0xFF0000FF},
            {255, 128, 128, 0, 0xFFFFFFFF},
            {16, 128, 128, 255, 0x00000000},
            {0, 0, 0, 0, 0},
            {0, 128, 128, 0, 0},
            {0, 255, 255, 255, 0},
    };
    for (const Worked& c : cases) {
        EXPECT_EQ(argb(c.y, c.cr, c.cb, c.t), c.colour)
                << c.y << "," << c.cr << "," << c.cb << "," << c.t;
        EXPECT_EQ(static_cast<uint32_t>(dvbjni::yccToArgb(c.y, c.cr, c.cb, c.t)), c.colour);
    }
}

TEST(Ycc, EveryInputMatchesTheReference) {
    int mismatches = 0;
    for (int y = 0; y < 256; ++y) {
        for (int cr = 0; cr < 256; ++cr) {
            for (int cb = 0; cb < 256; ++cb) {
                bool same = YCC2RGB_R(y, cr, cb) == refR(y, cr, cb) &&
                            YCC2RGB_G(y, cr, cb) == refG(y, cr, cb) &&
                            YCC2RGB_B(y, cr, cb) == refB(y, cr, cb);
                if (!same && ++mismatches <= 5) {
                    ADD_FAILURE() << "y " << y << " cr " << cr << " cb " << cb;
                }
            }
        }
        for (int t = 0; t < 256; ++t) {
            int expected = y == 0 ? 0 : 255 - t;
            if (YCC2RGB_A(y, t) != expected && ++mismatches <= 5) {
                ADD_FAILURE() << "alpha y " << y << " t " << t;
            }
        }
    }
    EXPECT_EQ(mismatches, 0);
}

// The packed colour that the CLUT readers hand to Java agrees with the four functions.
TEST(Ycc, PackedColourAgreesWithTheFunctions) {
    int mismatches = 0;
    for (int y = 0; y < 256; ++y) {
        for (int c = 0; c < 65536; c += 7) {
            int cr = c >> 8, cb = c & 0xFF, t = (y * 31 + c) & 0xFF;
            if (static_cast<uint32_t>(dvbjni::yccToArgb(y, cr, cb, t)) != argb(y, cr, cb, t) &&
                ++mismatches <= 5) {
                ADD_FAILURE() << "y " << y << " cr " << cr << " cb " << cb << " t " << t;
            }
        }
    }
    EXPECT_EQ(mismatches, 0);
}

}  // namespace
