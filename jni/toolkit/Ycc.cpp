#include "Ycc.h"

int YCC2RGB_R(unsigned char y, unsigned char cr, unsigned char /* cb */) {
    return y == 0 ? 0 : static_cast<int>(dvbjni::yccRed(y, cr));
}

int YCC2RGB_G(unsigned char y, unsigned char cr, unsigned char cb) {
    return y == 0 ? 0 : static_cast<int>(dvbjni::yccGreen(y, cr, cb));
}

int YCC2RGB_B(unsigned char y, unsigned char /* cr */, unsigned char cb) {
    return y == 0 ? 0 : static_cast<int>(dvbjni::yccBlue(y, cb));
}

int YCC2RGB_A(unsigned char y, unsigned char t) {
    return y == 0 ? 0 : 255 - t;
}
