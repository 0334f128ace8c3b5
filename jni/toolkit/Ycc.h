// Colours of subtitle CLUT entries: luminance Y, colour differences Cr and Cb, and
// transparency T (0 opaque) to R, G, B and alpha, by the integer ITU-R BT.601 conversion
// scaled by 1000:
//
//   R' = 1164 Y + 1596 Cr - 222912
//   G' = 1164 Y -  813 Cr -  392 Cb + 135616
//   B' = 1164 Y + 2017 Cb - 276800
//
// Each component is its sum divided by 1000, truncated toward zero and limited to 0..255;
// alpha is 255 - T. An entry with Y 0 is fully transparent: every component is 0.
#pragma once

#include <cstdint>

#define DVB_YCC_EXPORT __attribute__((visibility("default")))

DVB_YCC_EXPORT int YCC2RGB_R(unsigned char y, unsigned char cr, unsigned char cb);
DVB_YCC_EXPORT int YCC2RGB_G(unsigned char y, unsigned char cr, unsigned char cb);
DVB_YCC_EXPORT int YCC2RGB_B(unsigned char y, unsigned char cr, unsigned char cb);
DVB_YCC_EXPORT int YCC2RGB_A(unsigned char y, unsigned char t);

namespace dvbjni {

// A scaled sum as a component. Negative sums end at 0 whichever way they are rounded, so the
// sum is limited first and the division is one of non-negative numbers, free of branches.
inline uint32_t yccComponent(int32_t scaled) {
    int32_t limited = scaled < 0 ? 0 : (scaled > 255999 ? 255999 : scaled);
    return static_cast<uint32_t>(limited) / 1000u;
}

inline uint32_t yccRed(uint32_t y, uint32_t cr) {
    return yccComponent(static_cast<int32_t>(1164 * y + 1596 * cr) - 222912);
}

inline uint32_t yccGreen(uint32_t y, uint32_t cr, uint32_t cb) {
    return yccComponent(static_cast<int32_t>(1164 * y) - static_cast<int32_t>(813 * cr + 392 * cb) +
                        135616);
}

inline uint32_t yccBlue(uint32_t y, uint32_t cb) {
    return yccComponent(static_cast<int32_t>(1164 * y + 2017 * cb) - 276800);
}

// One entry as a Java colour: A in bits 31-24, then R, G and B.
inline int32_t yccToArgb(uint8_t y, uint8_t cr, uint8_t cb, uint8_t t) {
    uint32_t argb =
            (255u - t) << 24 | yccRed(y, cr) << 16 | yccGreen(y, cr, cb) << 8 | yccBlue(y, cb);
    return static_cast<int32_t>(y == 0 ? 0 : argb);
}

}  // namespace dvbjni
