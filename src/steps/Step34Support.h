// Arithmetic and the pixel walk shared by the per-pixel steps (3 and 4) and step 1's merge.
//
// Samples are 32-bit, but the settings text can hold any 32-bit parameter and an unclamped stage
// can hand on any 32-bit sample, so products are formed in 64 bits. Where even 64 bits may not
// hold a product its result is always clamped to 0..65535 afterwards, so saturating the product
// changes nothing: beyond 2^63 only its sign decides the clamp.
#pragma once

#include <cmath>
#include <cstdint>
#include <limits>

#include "kernel/PixelBlock.h"

namespace steps {

inline int32_t clampSample(int64_t v) { return v < 0 ? 0 : (v > 65535 ? 65535 : int32_t(v)); }

inline int32_t saturate32(int64_t v) {
    constexpr int64_t lo = std::numeric_limits<int32_t>::min(), hi = std::numeric_limits<int32_t>::max();
    return v < lo ? int32_t(lo) : (v > hi ? int32_t(hi) : int32_t(v));
}

inline int64_t mulSat(int64_t a, int64_t b) {
    int64_t r;
    if (!__builtin_mul_overflow(a, b, &r)) return r;
    return ((a < 0) != (b < 0)) ? std::numeric_limits<int64_t>::min() : std::numeric_limits<int64_t>::max();
}

// Truncation toward zero of a table entry; an amount from an extreme setting saturates instead of
// leaving the int range (which a plain conversion does not define).
inline int32_t truncToInt32(double v) {
    if (!(v == v)) return 0;
    if (v >= 2147483647.0) return std::numeric_limits<int32_t>::max();
    if (v <= -2147483648.0) return std::numeric_limits<int32_t>::min();
    return int32_t(v);
}

// The per-pixel walk of the colour steps: rows of src's inner rectangle in steps of its sampling, a
// cursor on src at the row's first pixel and one on dst at dst's inner x0, both moved one stored
// pixel right per column. onRow(y) runs before each row; onPixel(in, out) maps three samples to
// three. Samples of dst outside the walk keep what they held.
template <class OnRow, class OnPixel>
void walkPixels(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst, OnRow&& onRow, OnPixel&& onPixel) {
    if (src == nullptr || dst == nullptr || src->data == nullptr || dst->data == nullptr) return;
    const int32_t s = src->sampling;
    if (s <= 0) return;
    const KERNEL::cRect r = src->innerRect;
    const int32_t dx0 = dst->innerRect.x0;
    KERNEL::cPixel sc, dc;
    for (int64_t y = r.y0; y < r.y1; y += s) {
        onRow(int32_t(y));
        src->getPixel(sc, r.x0, int32_t(y));
        dst->getPixel(dc, dx0, int32_t(y));
        if (sc.channel[0] == nullptr || dc.channel[0] == nullptr) return;
        for (int64_t x = r.x0; x < r.x1; x += s) {
            const int32_t in[3] = {sc.s32(0), sc.s32(1), sc.s32(2)};
            int32_t out[3];
            onPixel(in, out);
            dc.s32(0) = out[0];
            dc.s32(1) = out[1];
            dc.s32(2) = out[2];
            sc.right();
            dc.right();
        }
    }
}

template <class OnPixel>
void walkPixels(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst, OnPixel&& onPixel) {
    walkPixels(src, dst, [](int32_t) {}, onPixel);
}

}  // namespace steps
