// Separable convolution with byte weights (blurKernel) of the working and the 8-bit RGB class.
#include <cmath>
#include <cstddef>
#include <vector>

#include "kernel/PixelBlock.h"
#include "kernel/ops/Frame.h"

namespace KERNEL {
namespace {

// Integer weights 255 * exp(-i^2 / divisor) for i = 0 .. R, R the last non-zero one (at most
// kMaxRadius). A sigma that is not positive (or NaN) counts as a tiny one: identity.
std::vector<int64_t> byteWeights(double divisor) {
    if (!(divisor > 1e-6)) divisor = 1e-6;
    std::vector<int64_t> w;
    for (int32_t i = 0; i <= ops::kMaxRadius; ++i) {
        const int64_t v = int64_t(255.0 * std::exp(-double(i) * i / divisor));
        if (v == 0) break;
        w.push_back(v);
    }
    return w;
}

// One pass (kRows along rows, else along columns) from rd into wr over rd's frame; each position
// sums the taps under a cursor that moves one stored pixel per tap. T is the sample type; kDown
// shifts a sample down to 8 bits before weighting (and the result back up).
template <typename T, bool kRows, int kDown>
void convolve(cPixelBlock* rd, cPixelBlock* wr, const std::vector<int64_t>& w) {
    const int32_t s = rd->sampling;
    const int32_t R = int32_t(w.size()) - 1;
    const int32_t Rp = R - R % s;
    int64_t N = w[0];
    for (int32_t k = s; k <= R; k += s) N += 2 * w[size_t(k)];
    const int32_t taps = 2 * Rp / s + 1;
    const cRect f = rd->innerRect;
    cPixel src, dst;
    auto one = [&](int32_t x, int32_t y) {
        rd->getPixel(src, kRows ? x - Rp : x, kRows ? y : y - Rp);
        wr->getPixel(dst, x, y);
        int64_t S[3] = {0, 0, 0};
        for (int32_t t = 0; t < taps; ++t) {
            const int64_t wt = w[size_t(std::abs(-Rp + t * s))];
            for (int k = 0; k < 3; ++k) {
                int64_t v = *reinterpret_cast<const T*>(src.channel[k]);
                if constexpr (kDown > 0) v = std::min<int64_t>(v >> kDown, 255);
                S[k] += wt * v;
            }
            if (kRows) src.right(); else src.down();
        }
        for (int k = 0; k < 3; ++k) *reinterpret_cast<T*>(dst.channel[k]) = T((S[k] << kDown) / N);
    };
    if (kRows) {
        for (int32_t y = f.y0; y < f.y1; y += s)
            for (int32_t x = f.x0; x < f.x1; x += s) one(x, y);
    } else {
        for (int32_t x = f.x0; x < f.x1; x += s)
            for (int32_t y = f.y0; y < f.y1; y += s) one(x, y);
    }
}

template <typename T, int kDown>
void blurKernelImpl(cPixelBlock* self, double divisor, cPixelBlock* destination, cMargin margin) {
    if (!ops::usable(self) || !ops::usable(destination)) return;
    const std::vector<int64_t> w = byteWeights(divisor);
    ops::cMarginScope scope({self, destination}, margin.dx, margin.dy);
    convolve<T, true, kDown>(self, destination, w);
    ops::BlockPtr copy = ops::lockedClone(destination);
    ops::cMarginScope scopeCopy({copy.get()}, 0, 0);
    convolve<T, false, kDown>(copy.get(), destination, w);
}

}  // namespace

// The working class weights with exp(-i^2 / (2 sigma)) on 8-bit precision.
void cRGB32PixelBlock::blurKernel(double sigma, cPixelBlock* destination, cMargin margin) {
    blurKernelImpl<int32_t, 8>(this, 2.0 * sigma, destination, margin);
}

// The 8-bit class uses a true Gaussian of sigma: exp(-i^2 / (2 sigma^2)).
void cRGBPixelBlock::blurKernel(double sigma, cPixelBlock* destination, cMargin margin) {
    blurKernelImpl<uint8_t, 0>(this, 2.0 * sigma * sigma, destination, margin);
}

}  // namespace KERNEL
