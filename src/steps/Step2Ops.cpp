#include "steps/Step2Ops.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdlib>
#include <vector>

#include "kernel/PixelBlock.h"
#include "kernel/ops/Frame.h"

using KERNEL::cPixel;
using KERNEL::cPixelBlock;
namespace ops = KERNEL::ops;

namespace step2 {
namespace {

constexpr int32_t kBandOffset = 32000;

int32_t& sampleAt(cPixelBlock* b, int32_t col, int32_t row, int c) {
    return reinterpret_cast<int32_t*>(b->data + size_t(row) * b->rowBytes + size_t(col) * b->bytesPerPixel)[c];
}

// Threshold remap of the wavelet forms, in 64 bits and held to the int32 range.
int64_t remap(int64_t t, int64_t weight) {
    if (t > 33) t = 2 * t - 33;
    if (t > 90) t = 2 * t - 90;
    return std::clamp<int64_t>(t * weight, INT32_MIN, INT32_MAX);
}

template <size_t kLevels>
void waveletShrink(cPixelBlock* src, cPixelBlock* dst, const std::array<int64_t, kLevels>& t, int32_t view) {
    if (!ops::usable(src) || !ops::usable(dst)) return;
    if (src->sampling >= 2) {
        src->copyTo(dst);
        return;
    }
    static constexpr int64_t kWeights[5] = {50, 30, 20, 15, 10};
    std::array<int64_t, kLevels> T{};
    for (size_t i = 0; i < kLevels; ++i) T[i] = remap(t[i], kWeights[i]);
    // Level blocks plus the residual. Each starts as a copy of src so that taps the split reaches
    // outside the area an earlier level wrote read defined values.
    std::array<ops::BlockPtr, kLevels + 1> w;
    for (auto& b : w) {
        b.reset(src->createEmpty());
        b->lock();
        src->copyTo(b.get());
    }
    for (size_t i = 0; i < kLevels; ++i) splitLevel(int32_t(1) << i, w[i].get(), w[i + 1].get());

    std::array<cPixelBlock*, kLevels + 3> blocks{};
    blocks[0] = src;
    blocks[1] = dst;
    for (size_t i = 0; i <= kLevels; ++i) blocks[i + 2] = w[i].get();
    ops::forEachPixel<kLevels + 3>(blocks, [&](int32_t** p) {
        int64_t sum = 0, chosen = 0;
        for (size_t i = 0; i < kLevels; ++i) {
            const int64_t d = int64_t(p[i + 2][0]) - kBandOffset;
            int64_t s = 0;
            if (std::llabs(d) >= T[i]) s = d >= 1 ? d - T[i] : d + T[i];
            sum += s;
            if (int64_t(view) == int64_t(i) + 1) chosen = s;
        }
        const int64_t residual = p[kLevels + 2][0];
        if (view <= 0) {
            p[1][0] = ops::saturate32(residual + sum);
            p[1][1] = p[0][1];
            p[1][2] = p[0][2];
        } else if (view <= int32_t(kLevels)) {
            p[1][0] = ops::saturate32(2 * chosen + kBandOffset);
            p[1][1] = p[1][2] = kBandOffset;
        } else {
            p[1][0] = ops::saturate32(residual);
            p[1][1] = p[1][2] = kBandOffset;
        }
    });
}

}  // namespace

// The column taps reach `step` rows above and below the covered area, so the row pass runs over
// those rows too (as far as they are stored): every covered pixel then gets a defined mean.
void splitLevel(int32_t step, cPixelBlock* in, cPixelBlock* out) {
    if (!ops::usable(in) || !ops::usable(out) || in->sampling != 1 || !(in->outerRect == out->outerRect)) return;
    const KERNEL::cRect o = in->outerRect, r = in->innerRect;
    const int32_t cx0 = std::max<int32_t>(r.x0, o.x0), cx1 = std::min<int32_t>(r.x1, o.x1 - 1);
    const int32_t cy0 = std::max<int32_t>(r.y0, o.y0), cy1 = std::min<int32_t>(r.y1, o.y1 - 1);
    if (cx0 > cx1 || cy0 > cy1) return;
    step = std::clamp(step, 1, ops::kMaxRadius);
    const int32_t W = o.width(), H = o.height();
    auto cx = [&](int32_t x) { return std::clamp(x - o.x0, 0, W - 1); };
    auto cy = [&](int32_t y) { return std::clamp(y - o.y0, 0, H - 1); };
    const int32_t ry0 = std::max<int32_t>(cy0 - step, o.y0), ry1 = std::min<int32_t>(cy1 + step, o.y1 - 1);
    for (int32_t y = ry0; y <= ry1; ++y) {
        const int32_t row = cy(y);
        for (int32_t x = cx0; x <= cx1; ++x) {
            const int64_t s = int64_t(sampleAt(in, cx(x - step), row, 0)) + sampleAt(in, cx(x), row, 0) +
                              sampleAt(in, cx(x + step), row, 0);
            sampleAt(in, cx(x), row, 1) = int32_t(s / 3);
        }
    }
    for (int32_t x = cx0; x <= cx1; ++x) {
        const int32_t col = cx(x);
        for (int32_t y = cy0; y <= cy1; ++y) {
            const int64_t s = int64_t(sampleAt(in, col, cy(y - step), 1)) + sampleAt(in, col, cy(y), 1) +
                              sampleAt(in, col, cy(y + step), 1);
            const int32_t m = int32_t(s / 3);
            sampleAt(out, col, cy(y), 0) = m;
            int32_t& L = sampleAt(in, col, cy(y), 0);
            L = ops::saturate32(int64_t(L) + kBandOffset - m);
        }
    }
}

void waveletShrink3(cPixelBlock* src, cPixelBlock* dst, int32_t t1, int32_t t2, int32_t t3, int32_t view) {
    waveletShrink<3>(src, dst, {t1, t2, t3}, view);
}

void waveletShrink5(cPixelBlock* src, cPixelBlock* dst, int32_t t1, int32_t t2, int32_t t3, int32_t t4, int32_t t5,
                    int32_t view) {
    waveletShrink<5>(src, dst, {t1, t2, t3, t4, t5}, view);
}

void layeredSmooth(cPixelBlock* src, cPixelBlock* dst, int32_t r1, int32_t d1, int32_t t1, double sigma, int32_t r2,
                   int32_t t2, int32_t thr2, int32_t budget, int32_t view) {
    if (!ops::usable(src) || !ops::usable(dst)) return;
    ops::BlockPtr M(src->createEmpty()), B(src->createEmpty());
    M->lock();
    B->lock();
    src->copyTo(dst);
    src->copyTo(B.get());  // defined outside the blurred frame
    src->blur(sigma, B.get());
    if (r1 > 0) {
        const int32_t side = 2 * std::min(r1, ops::kMaxRadius) + 1;
        src->copyTo(M.get());
        src->rankRangeFilter(r1, 15, ops::saturate32(int64_t(side) * side - t1), ops::saturate32(int64_t(t1) + 2),
                             ops::saturate32(-int64_t(d1)), 8, M.get());
        const int32_t s = src->sampling;
        const int32_t x0 = src->innerRect.x0, y0 = src->innerRect.y0;
        const int32_t n = ops::stepCount(x0, src->innerRect.x1, s);
        int32_t i = 0, j = -1;
        ops::forEachPixel<4, true>({src, dst, M.get(), B.get()}, [&](int32_t** p) {
            if (i % (n > 0 ? n : 1) == 0) {
                i = 0;
                ++j;
            }
            const int64_t x = int64_t(x0) + int64_t(i) * s, y = int64_t(y0) + int64_t(j) * s;
            ++i;
            const bool blend = p[2][0] <= 32000 && p[0][0] >= 12000;
            p[1][0] = blend ? int32_t((int64_t(p[3][0]) + p[0][0]) >> 1) : p[0][0];
            p[1][1] = p[0][1];
            p[1][2] = p[0][2];
            if (view == 1 && blend && (x + y) % 3 == 0) p[1][0] = std::max<int32_t>(p[1][0] - 10000, 0);
        });
    }
    if (r2 > 0 && view != 1 && view != 2) {
        const int32_t side = 2 * std::min(r2, ops::kMaxRadius) + 1;
        dst->copyTo(M.get());
        M->rankRangeFilter(r2, thr2, ops::saturate32(int64_t(side) * side - t2), ops::saturate32(int64_t(t2) + 2), 0,
                           8, dst);
    }
    if (src->sampling == 1 && budget > 0 && view != 1 && view != 2 && view != 3) {
        const KERNEL::cRect f = src->innerRect;
        const int32_t gx0 = f.x0 / 20 * 20, gy0 = f.y0 / 20 * 20;
        cPixel pd, pb;
        for (int32_t cy = gy0; cy < f.y1; cy += 20) {
            for (int32_t cx = gx0; cx < f.x1; cx += 20) {
                int64_t b = int64_t(budget) * 400;
                bool changed = true;
                while (b > 0 && changed) {
                    const int64_t before = b;
                    for (int32_t y = cy; y < cy + 20; ++y) {
                        dst->getPixel(pd, cx, y);
                        B->getPixel(pb, cx, y);
                        for (int32_t x = 0; x < 20; ++x, pd.right(), pb.right()) {
                            const int64_t diff = int64_t(pb.s32(0)) - pd.s32(0);
                            if (std::llabs(diff) <= 250) {
                                pd.s32(0) = pb.s32(0);
                            } else {
                                pd.s32(0) += diff > 0 ? 250 : -250;
                                b -= 250;
                            }
                        }
                    }
                    changed = b != before;
                }
            }
        }
    }
}

}  // namespace step2
