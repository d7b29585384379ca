// Rank range filter (working class): samples at or beyond a window's high or low rank go to the
// median when they lie near it; a negative channel writes a texture mask instead.
#include <cstddef>
#include <cstdlib>

#include "kernel/PixelBlock.h"
#include "kernel/ops/Histogram.h"

namespace KERNEL {

void cRGB32PixelBlock::rankRangeFilter(int32_t radius, int32_t threshold, int32_t rankA, int32_t rankB,
                                       int32_t channel, int32_t bits, cPixelBlock* destination, cMargin margin) {
    if (sampling <= 0 || radius / sampling < 1) return;
    rankRangeFilterWorker(radius, threshold, std::max(rankA, rankB), std::min(rankA, rankB), channel, bits,
                          destination, margin);
}

void cRGB32PixelBlock::rankRangeFilterWorker(int32_t radius, int32_t threshold, int32_t high, int32_t low,
                                             int32_t channel, int32_t bits, cPixelBlock* destination,
                                             cMargin margin) {
    if (!ops::usable(this) || !ops::usable(destination)) return;
    const int32_t r = std::min(radius / sampling, ops::kMaxRadius);
    if (r < 1) return;
    const bool maskMode = channel < 0;
    const int64_t maskLimit = maskMode ? -int64_t(channel) : 0;
    const int32_t c = maskMode ? 0 : std::min(channel, 2);
    const ops::cBins bins(bits);
    const int32_t total = (2 * r + 1) * (2 * r + 1);
    // Ranks outside the window (e.g. (2r + 1)^2 - t with a negative t) are held to 1..total.
    ops::cQuantile q[3];
    q[0].rank = (total + 1) / 2;
    q[1].rank = std::clamp(high, 1, total);
    q[2].rank = std::clamp(low, 1, total);
    const int64_t limit = int64_t(threshold) * 256;
    const size_t dOff = size_t(c) * destination->bytesPerSample;
    ops::cMarginScope scope({this, destination}, margin.dx, margin.dy);
    ops::slideHistogram<int32_t, 3>(
        this, destination, r, c, bins, q, [](const uint8_t* p) { return *reinterpret_cast<const int32_t*>(p); },
        [&](int32_t i, int32_t v, cPixel& d, ops::cQuantile(&qq)[3]) {
            const int32_t Q = qq[0].bin << bins.shift;
            const int32_t H = qq[1].bin << bins.shift;
            const int32_t L = qq[2].bin << bins.shift;
            int32_t out = v;
            if (i == 0)
                out = Q;
            else if ((v <= L || v >= H) && std::llabs(int64_t(v) - Q) < limit)
                out = Q;
            *reinterpret_cast<int32_t*>(d.channel[0] + dOff) = out;
            // The mask covers every position, the row's first included, so it is a mask throughout.
            if (maskMode) d.s32(0) = (std::llabs(int64_t(H) - L) / 256 < maskLimit) ? 0 : 65535;
        });
}

}  // namespace KERNEL
