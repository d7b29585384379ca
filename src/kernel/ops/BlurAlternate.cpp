// blurAlternate (working class): a blur held back by a strength. The result is
// src + (blur - src) * strength / 100, strength clamped to 0..100, so 100 is the plain blur and 0
// leaves the receiver's samples.
#include <cstddef>

#include "kernel/PixelBlock.h"
#include "kernel/ops/Frame.h"

namespace KERNEL {
namespace {

void mixBack(cPixelBlock* self, cPixelBlock* blurred, int32_t strength, cPixelBlock* destination, cMargin margin) {
    const int64_t k = std::clamp(strength, 0, 100);
    ops::cMarginScope scope({self, destination}, margin.dx, margin.dy);
    ops::cMarginScope scopeB({blurred}, margin.dx, margin.dy);
    ops::forEachPixel<3>({self, blurred, destination}, [k](int32_t** p) {
        for (int c = 0; c < 3; ++c) p[2][c] = ops::saturate32(p[0][c] + (int64_t(p[1][c]) - p[0][c]) * k / 100);
    });
}

}  // namespace

void cRGB32PixelBlock::blurAlternate(double sigma, int32_t strength, cPixelBlock* destination, cMargin margin) {
    if (sigma < 2.5)
        blurAlternateKernel(sigma < 0.2 ? 0.2 : sigma, strength, destination, margin);
    else
        blurAlternateLarge(float(sigma), strength, destination, margin);
}

void cRGB32PixelBlock::blurAlternateKernel(double sigma, int32_t strength, cPixelBlock* destination,
                                           cMargin margin) {
    if (!ops::usable(this) || !ops::usable(destination)) return;
    ops::BlockPtr b = ops::lockedClone(this);
    blurKernel(sigma, b.get(), margin);
    mixBack(this, b.get(), strength, destination, margin);
}

void cRGB32PixelBlock::blurAlternateLarge(float sigma, int32_t strength, cPixelBlock* destination, cMargin margin) {
    if (!ops::usable(this) || !ops::usable(destination)) return;
    ops::BlockPtr b = ops::lockedClone(this);
    blurLarge(sigma, b.get(), margin);
    mixBack(this, b.get(), strength, destination, margin);
}

}  // namespace KERNEL
