// fill, invert and passThrough of the two classes that implement them.
#include <cstddef>

#include "kernel/PixelBlock.h"
#include "kernel/ops/Frame.h"

namespace KERNEL {

void cRGB32PixelBlock::fill(uint32_t c0, uint32_t c1, uint32_t c2) {
    const int32_t v[3] = {int32_t(c0), int32_t(c1), int32_t(c2)};
    ops::forEachPixel<1>({this}, [&v](int32_t** p) {
        p[0][0] = v[0];
        p[0][1] = v[1];
        p[0][2] = v[2];
    });
}

void cRGBPixelBlock::fill(uint32_t c0, uint32_t c1, uint32_t c2) {
    ops::walkFrame(this, nullptr, [&](cPixel& a, cPixel&, int32_t, int32_t) {
        a.s8(0) = uint8_t(c0);
        a.s8(1) = uint8_t(c1);
        a.s8(2) = uint8_t(c2);
    });
}

// 65280 = 255 * 256: the working image of the 8-bit complement, unclamped.
void cRGB32PixelBlock::invert(cPixelBlock* destination, cMargin margin) {
    ops::cMarginScope scope({this, destination}, margin.dx, margin.dy);
    ops::forEachPixel<2>({this, destination}, [](int32_t** p) {
        for (int c = 0; c < 3; ++c) p[1][c] = int32_t(65280 - int64_t(p[0][c]));
    });
}

void cRGBPixelBlock::passThrough(int32_t, cMargin) {}

}  // namespace KERNEL
