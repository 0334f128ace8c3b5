#include <gtest/gtest.h>

#include <cstdint>

#include "Ycc.h"

namespace {

// The conversion written from the centred BT.601 form, in 64 bits, with C's own truncating
// division: independent of the folded constants and the limiting order of the library.
int reference(int y, int64_t scaled) {
    int64_t q = scaled / 1000;
    return y == 0 || q < 0 ? 0 : q > 255 ? 255 : static_cast<int>(q);
}

// Every input against the reference, through the four exported functions and the packed colour
// of the CLUT readers alike.
TEST(Ycc, EveryInputMatchesTheReference) {
    int mismatches = 0;
    for (int y = 0; y < 256; ++y)
        for (int cr = 0; cr < 256; ++cr)
            for (int cb = 0; cb < 256; ++cb) {
                int y16 = 1164 * (y - 16);
                int t = (y * 31 + cr + cb) & 0xFF;
                uint32_t want = (y == 0 ? 0u : 255u - t) << 24 |
                                reference(y, y16 + 1596 * (cr - 128)) << 16 |
                                reference(y, y16 - 813 * (cr - 128) - 392 * (cb - 128)) << 8 |
                                reference(y, y16 + 2017 * (cb - 128));
                bool same = (uint32_t(YCC2RGB_A(y, t)) << 24 | YCC2RGB_R(y, cr, cb) << 16 |
                             YCC2RGB_G(y, cr, cb) << 8 | YCC2RGB_B(y, cr, cb)) == want &&
                            uint32_t(dvbjni::yccToArgb(y, cr, cb, t)) == want;
                if (!same && ++mismatches <= 5) ADD_FAILURE() << y << "," << cr << "," << cb;
            }
    EXPECT_EQ(mismatches, 0);
}

}  // namespace
