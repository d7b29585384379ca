// Thresholded median of one channel (working class) and its 8-bit variant.
#include <cstddef>
#include <cstdlib>

#include "kernel/PixelBlock.h"
#include "kernel/ops/Histogram.h"

namespace KERNEL {
namespace {

// Shared by both classes: kScale shifts an 8-bit sample up to the working scale and back.
template <typename T, int kScale>
void medianWorker(cPixelBlock* self, int32_t radius, int32_t threshold, int32_t channel, int32_t bits,
                  cPixelBlock* destination, cMargin margin) {
    if (!ops::usable(self) || !ops::usable(destination)) return;
    const int32_t r = std::min(radius / self->sampling, ops::kMaxRadius);
    if (r < 1) return;
    const int32_t c = std::clamp(channel, 0, 2);
    const ops::cBins bins(bits);
    const int32_t n = 2 * r + 1;
    ops::cQuantile q[1];
    q[0].rank = (n * n + 1) / 2;
    // 64-bit so that a huge threshold from the settings cannot overflow.
    const int64_t limit = int64_t(threshold) * 256;
    const size_t dOff = size_t(c) * destination->bytesPerSample;
    ops::cMarginScope scope({self, destination}, margin.dx, margin.dy);
    ops::slideHistogram<T, 1>(
        self, destination, r, c, bins, q,
        [](const uint8_t* p) { return int32_t(*reinterpret_cast<const T*>(p)) << kScale; },
        [&](int32_t i, int32_t v, cPixel& d, ops::cQuantile(&qq)[1]) {
            const int32_t M = qq[0].bin << bins.shift;
            const int32_t out = (i == 0 || std::llabs(int64_t(M) - v) < limit) ? M : v;
            *reinterpret_cast<T*>(d.channel[0] + dOff) = T(out >> kScale);
        });
}

}  // namespace

void cRGB32PixelBlock::medianFilter(int32_t radius, int32_t threshold, int32_t channel, int32_t bits,
                                    cPixelBlock* destination, cMargin margin) {
    if (sampling <= 0 || radius / sampling < 1) return;
    medianFilterWorker(radius, threshold, channel, bits, destination, margin);
}

void cRGB32PixelBlock::medianFilterWorker(int32_t radius, int32_t threshold, int32_t channel, int32_t bits,
                                          cPixelBlock* destination, cMargin margin) {
    medianWorker<int32_t, 0>(this, radius, threshold, channel, bits, destination, margin);
}

// The 8-bit median counts bytes on the working scale (byte << 8), so bits and threshold mean what
// they mean for the working class; the result is the bin's lower edge back in bytes.
void cRGBPixelBlock::medianFilterWorker(int32_t radius, int32_t threshold, int32_t channel, int32_t bits,
                                        cPixelBlock* destination, cMargin margin) {
    medianWorker<uint8_t, 8>(this, radius, threshold, channel, bits, destination, margin);
}

}  // namespace KERNEL
