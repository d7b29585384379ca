// The variants of step 2 on a Lab working block, chosen by `mode`.
#include <algorithm>
#include <cstddef>
#include <cstdlib>

#include "kernel/PixelBlock.h"
#include "kernel/StageTimer.h"
#include "kernel/ops/Frame.h"
#include "steps/Step2.h"
#include "steps/Step2Ops.h"

using KERNEL::cPixel;
using KERNEL::cPixelBlock;
namespace ops = KERNEL::ops;

namespace {

struct cRankPreset {
    int32_t radius, threshold, rankA, rankB;
};
constexpr cRankPreset kRankDefault{1, 255, 9, 2};
constexpr cRankPreset kRank3[] = {{1, 10, 9, 2},  {1, 15, 9, 2},  {1, 20, 8, 3},  {2, 10, 25, 4}, {2, 10, 24, 5},
                                  {2, 15, 24, 5}, {3, 13, 44, 7}, {3, 15, 43, 8}, {3, 16, 42, 9}, {4, 15, 61, 22}};
constexpr cRankPreset kRank6[] = {{1, 80, 9, 2},  {1, 120, 8, 3}, {2, 80, 24, 3},
                                  {2, 120, 22, 5}, {3, 80, 46, 5}, {3, 120, 42, 9}};

template <size_t N>
cRankPreset presetRow(const cRankPreset (&table)[N], int32_t v) {
    return (v >= 1 && size_t(v) <= N) ? table[v - 1] : kRankDefault;
}

void rankPreset(cPixelBlock* src, cPixelBlock* dst, const cRankPreset& p) {
    src->copyTo(dst);
    src->rankRangeFilter(p.radius, p.threshold, p.rankA, p.rankB, 0, 8, dst);
}

// Clamps v into lo..hi computed in 64 bits.
int32_t within(int64_t v, int64_t centre, int64_t reach) {
    return ops::saturate32(std::clamp(v, centre - reach, centre + reach));
}

// The N, S, W, E neighbours are one stored pixel away, clamped to the block.
struct cCross {
    int64_t n, s, w, e;
};
cCross crossL(const cPixel& c) {
    auto at = [&](int dx, int dy) { return int64_t(*reinterpret_cast<const int32_t*>(ops::neighbour(c, dx, dy))); };
    return {at(0, -1), at(0, 1), at(-1, 0), at(1, 0)};
}

void impulse(const cStep2& st, cPixelBlock* src, cPixelBlock* dst) {
    const int64_t k = 50 - int64_t(st.impulseFlatness) / 2;
    const int64_t off = (10 - int64_t(st.impulseLevel) / 4) * 256;
    ops::walkFrame(src, dst, [&](cPixel& a, cPixel& d, int32_t, int32_t) {
        const int64_t C = a.s32(0);
        const cCross q = crossL(a);
        const int64_t mx = std::max({q.n, q.s, q.w, q.e}), mn = std::min({q.n, q.s, q.w, q.e});
        const int64_t avg = (q.n + q.s + q.w + q.e) >> 2;
        int64_t out = C;
        if (((mx - mn) >> 8) < k) {
            if (C > mx + off) out = (C + 2 * avg) / 3;
            if (C < mn - off) out = (out + 2 * avg) / 3;
        }
        const int32_t av = a.s32(1), bv = a.s32(2);
        d.s32(0) = ops::saturate32(out);
        d.s32(1) = av;
        d.s32(2) = bv;
    });
}

void medianRankBlend(const cStep2& st, cPixelBlock* src, cPixelBlock* dst) {
    const int64_t k = 10 - int64_t(st.smoothStrength4) / 10;
    ops::BlockPtr W(src->createEmpty());
    W->lock();
    src->copyTo(dst);
    src->medianFilter(1, ops::saturate32(int64_t(st.smoothThreshold4) + k + 1), 0, 8, dst);
    dst->copyTo(W.get());
    W->rankRangeFilter(1, ops::saturate32(k), 9, 2, 0, 8, dst);
    // Texture: how far L differs from its neighbours, scaled into 0..65535.
    cPixel w;
    ops::walkFrame(dst, nullptr, [&](cPixel& d, cPixel&, int32_t x, int32_t y) {
        const int64_t C = d.s32(0);
        const cCross q = crossL(d);
        const int64_t t = (std::llabs(C - q.w) + std::llabs(C - q.e) + std::llabs(C - q.n) + std::llabs(C - q.s) - 1024) * 12;
        W->getPixel(w, x, y);
        w.s32(0) = int32_t(std::clamp<int64_t>(t, 0, 65535));
        w.s32(1) = d.s32(1);
        w.s32(2) = d.s32(2);
    });
    ops::forEachPixel<3>({src, dst, W.get()}, [](int32_t** p) {
        const int64_t m = std::clamp<int64_t>(p[2][0], 0, 65535) >> 12;
        for (int c = 0; c < 3; ++c) p[1][c] = int32_t(((16 - m) * p[1][c] + m * p[0][c]) >> 4);
    });
}

void lightBlur(const cStep2& st, cPixelBlock* src, cPixelBlock* dst) {
    src->blur(1.0, dst);
    const int64_t limit = st.edgeLimit5 / 2, keep = st.lumaKeepPercent5;
    ops::forEachPixel<2>({src, dst}, [&](int32_t** p) {
        const int64_t s = p[0][0], d = p[1][0];
        if ((std::llabs(s - d) >> 8) > limit)
            p[1][0] = p[0][0];
        else
            p[1][0] = ops::saturate32((keep * s + (100 - keep) * d) / 100);
    });
}

void referenceShrink(const cStep2& st, cPixelBlock* src, cPixelBlock* dst) {
    src->copyTo(dst);
    const int64_t h = st.waveletStrength7 / 2;
    step2::waveletShrink3(src, dst, ops::saturate32(h * 60 / 100), ops::saturate32(h * 40 / 100),
                          ops::saturate32(h * 20 / 100), 0);
    // A tolerance with q + 2 = 0 (colourTolerance7 of -3 or -4) would divide by zero; it is taken as 1.
    int64_t div = 2 * int64_t(st.colourTolerance7) / 3 + 2;
    if (div == 0) div = 1;
    const int64_t R = int64_t(st.referenceRed7) * 256, G = int64_t(st.referenceGreen7) * 256,
                  B = int64_t(st.referenceBlue7) * 256;
    const int64_t Lr = ((2 * R + 3 * G + B) * 170) >> 10, ar = ((R - B) >> 1) + 32767, br = ((G - B) >> 1) + 32767;
    ops::forEachPixel<2>({src, dst}, [&](int32_t** p) {
        const int64_t dist = (std::llabs(ar - p[0][1]) + std::llabs(Lr - p[0][0]) / 2 + std::llabs(br - p[0][2])) / 2;
        const int64_t w = std::clamp<int64_t>(dist / div - 20, 0, 100);
        p[1][0] = ops::saturate32(((100 - w) * p[1][0] + w * p[0][0]) / 100);
        p[1][1] = p[0][1];
        p[1][2] = p[0][2];
    });
}

}  // namespace

void cStep2::Process(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst) {
    KERNEL::timing::cStageClock clock(KERNEL::timing::kStep2);
    // A negative mode is treated like an unknown one: dst becomes a copy of src.
    switch (mode) {
        case 0:
            return;
        case 1:
            impulse(*this, src, dst);
            return;
        case 2:
            src->copyTo(dst);
            src->medianFilter(lumaMedianRadius, ops::saturate32(31 - int64_t(lumaMedianKeep)), 0, 8, dst);
            return;
        case 3:
            rankPreset(src, dst, presetRow(kRank3, rankPreset3));
            return;
        case 4:
            medianRankBlend(*this, src, dst);
            return;
        case 5:
            lightBlur(*this, src, dst);
            return;
        case 6:
            rankPreset(src, dst, presetRow(kRank6, rankPreset6));
            return;
        case 7:
            referenceShrink(*this, src, dst);
            return;
        case 9:
            switch (preset9) {
                case 0: step2::layeredSmooth(src, dst, 3, 3, 4, 2, 2, 2, 5, 40, 0); return;
                case 1: step2::layeredSmooth(src, dst, 3, 4, 6, 2, 2, 3, 10, 60, 0); return;
                case 2: step2::waveletShrink3(src, dst, 15, 10, 4, 0); return;
                case 3: step2::waveletShrink5(src, dst, 40, 25, 10, 5, 5, 0); return;
                default: src->copyTo(dst); return;
            }
        case 100:
            src->blur(6.0, dst);
            ops::forEachPixel<2>({src, dst}, [](int32_t** p) { p[1][0] = int32_t((int64_t(p[1][0]) + p[0][0]) / 2); });
            return;
        case 101:
            src->blur(5.0, dst);
            ops::forEachPixel<2>({src, dst},
                                 [](int32_t** p) { p[1][0] = int32_t((int64_t(p[0][0]) + 2 * int64_t(p[1][0])) / 3); });
            return;
        case 102:
            step2::waveletShrink5(src, dst, 30, 25, 15, 10, 5, 0);
            return;
        case 103:
            src->copyTo(dst);
            src->rankRangeFilter(4, 255, 75, 7, 0, 8, dst);
            return;
        case 104:
            src->blur(6.0, dst);
            ops::forEachPixel<2>({src, dst},
                                 [](int32_t** p) { p[1][0] = int32_t((int64_t(p[1][0]) + 2 * int64_t(p[0][0])) / 3); });
            return;
        case 105:
            step2::waveletShrink3(src, dst, 5, 3, 2, 0);
            return;
        case 106: {
            ops::BlockPtr W(src->createEmpty());
            W->lock();
            src->copyTo(W.get());
            step2::waveletShrink5(src, W.get(), 60, 45, 25, 20, 15, 0);
            ops::forEachPixel<3>({src, dst, W.get()}, [](int32_t** p) {
                p[1][0] = int32_t((3 * int64_t(p[0][0]) + 7 * int64_t(p[2][0])) / 10);
                p[1][1] = p[0][1];
                p[1][2] = p[0][2];
            });
            return;
        }
        case 107:
            src->blur(5.0, dst);
            ops::forEachPixel<2>({src, dst}, [](int32_t** p) {
                p[1][0] = p[0][0];
                p[1][1] = within(p[1][1], p[0][1], 2000);
                p[1][2] = within(p[1][2], p[0][2], 2000);
            });
            return;
        case 108: {
            ops::BlockPtr W(src->createEmpty());
            W->lock();
            src->copyTo(dst);
            src->copyTo(W.get());
            src->blur(20.0, W.get());
            ops::forEachPixel<3>({src, dst, W.get()}, [](int32_t** p) {
                p[1][0] = within(p[2][0], p[0][0], 300);
                p[1][1] = within(p[2][1], p[0][1], 1000);
                p[1][2] = within(p[2][2], p[0][2], 1000);
            });
            return;
        }
        default:
            src->copyTo(dst);
            return;
    }
}
