// Working blocks over test-owned memory, a leak-checking fixture, and a plain cursor-walk blurLarge
// to compare against.
#pragma once

#include <gtest/gtest.h>

#include <cstring>
#include <memory>
#include <random>
#include <vector>

#include "kernel/PixelBlock.h"
#include "kernel/ops/Frame.h"
#include "support/MallocHost.h"

namespace opstest {

using namespace KERNEL;

struct Block {
    std::vector<int32_t> mem;
    std::unique_ptr<cRGB32PixelBlock> b;
    int32_t cols = 0, rows = 0;
    int32_t& at(int32_t col, int32_t row, int c) { return mem[(size_t(row) * cols + col) * 3 + c]; }
    cRGB32PixelBlock* operator->() { return b.get(); }
    cRGB32PixelBlock* get() { return b.get(); }
};

// Every host buffer must be given back by the end of each test.
class LeakCheckedTest : public ::testing::Test {
protected:
    void TearDown() override { EXPECT_EQ(host.liveBuffers(), 0u) << "leaked host buffer"; }
    testsupport::MallocHost host;
};

inline Block makeBlock(cRect outer, cRect inner, int32_t s = 1) {
    Block k;
    k.cols = outer.width() / s;
    k.rows = outer.height() / s;
    k.mem.assign(size_t(k.cols) * k.rows * 3, 0);
    k.b = std::make_unique<cRGB32PixelBlock>(reinterpret_cast<uint8_t*>(k.mem.data()), outer, inner, 4, 12, s,
                                             kModeRGB32, uint32_t(k.cols * 12));
    return k;
}
inline Block copyOf(Block& src) {
    Block k = makeBlock(src->outerRect, src->innerRect, src->sampling);
    k.mem = src.mem;
    return k;
}
inline void fillRandom(Block& k, uint32_t seed, int32_t lo = 0, int32_t hi = 65535) {
    std::mt19937 rng(seed);
    std::uniform_int_distribution<int32_t> d(lo, hi);
    for (auto& v : k.mem) v = d(rng);
}

// blurLarge exactly as described: cursors that move one stored pixel per step, every pass over
// every position, no shortcuts.
inline void referenceBlurLarge(cPixelBlock* self, float sigma, cPixelBlock* dst, cMargin margin) {
    const int32_t s = self->sampling;
    const int32_t R = int32_t(sigma), r = R / s, rr = r * s, n = 2 * r + 1;
    const float f = 1.0f / float(n);
    const int32_t P = (sigma - float(R) >= 0.5f) ? 3 : 2;
    std::unique_ptr<cPixelBlock> A(self->clone()), B(dst->clone());
    A->lock();
    B->lock();
    cPixelBlock* rd = A.get();
    cPixelBlock* wr = B.get();
    auto pass = [&](bool rows, int32_t e) {
        const cRect fr = rd->innerRect;
        const int32_t q0 = rows ? fr.y0 : fr.x0, q1 = rows ? fr.y1 : fr.x1;
        const int32_t p0 = rows ? fr.x0 : fr.y0, p1 = rows ? fr.x1 : fr.y1;
        for (int32_t q = q0; q < q1; q += s) {
            auto at = [&](cPixelBlock* b, cPixel& c, int32_t p) { rows ? b->getPixel(c, p, q) : b->getPixel(c, q, p); };
            auto move = [&](cPixel& c) { rows ? c.right() : c.down(); };
            cPixel init, trail, lead, w;
            at(rd, init, p0 - e - rr);
            int32_t S[3] = {0, 0, 0};
            for (int32_t k = 0; k < n; ++k) {
                for (int c = 0; c < 3; ++c) S[c] += init.s32(c);
                move(init);
            }
            at(rd, trail, p0 - e - rr);
            at(rd, lead, p0 - e + rr);
            at(wr, w, p0 - e);
            for (int32_t p = p0 - e; p < p1 + e; p += s) {
                for (int c = 0; c < 3; ++c) w.s32(c) = int32_t(float(S[c]) * f);
                for (int c = 0; c < 3; ++c) S[c] -= trail.s32(c);
                move(trail);
                move(lead);
                move(w);
                for (int c = 0; c < 3; ++c) S[c] += lead.s32(c);
            }
        }
    };
    {
        ops::cMarginScope a({self, dst}, margin.dx, margin.dy + 3 * rr);
        ops::cMarginScope b({A.get(), B.get()}, margin.dx, margin.dy + 3 * rr);
        for (int32_t k = 1; k <= P; ++k) {
            pass(true, (P - k) * rr);
            std::swap(rd, wr);
        }
    }
    ops::cMarginScope a({self, dst}, margin.dx, margin.dy);
    ops::cMarginScope b({A.get(), B.get()}, margin.dx, margin.dy);
    for (int32_t k = 1; k <= P; ++k) {
        pass(false, (P - k) * rr);
        std::swap(rd, wr);
    }
    const cRect area = dst->innerRect;
    cPixelBlock::copyRegion(rd, dst, area.x0, area.y0, area.x0, area.y0, area);
}

}  // namespace opstest
