// Block operations through the kernel API on working blocks over test memory.
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>

#include "ops/OpsSupport.h"

using namespace opstest;

namespace {

using Ops = LeakCheckedTest;

struct BlurCase {
    cRect outer, inner;
    int32_t sampling;
    float sigma;
    cMargin margin;
};

TEST_F(Ops, BlurLargeMatchesCursorReference) {
    const BlurCase cases[] = {
        {{0, 60, 0, 50}, {10, 50, 10, 40}, 1, 6.0f, {}},
        {{0, 60, 0, 50}, {-20, 70, -15, 65}, 1, 6.0f, {}},     // sticks out of the stored block
        {{5, 45, -7, 33}, {0, 50, -10, 40}, 1, 2.7f, {2, 3}},  // three passes, margin
        {{0, 31, 0, 29}, {3, 28, 2, 27}, 1, 3.9f, {}},
        {{0, 60, 0, 60}, {10, 50, 10, 50}, 2, 6.0f, {}},       // sampling 2
        {{-6, 54, -4, 56}, {-11, 61, -9, 63}, 2, 6.5f, {1, 1}},  // odd negative coordinates, sampling 2
        {{0, 9, 0, 7}, {-30, 40, -30, 40}, 1, 6.0f, {}},       // block smaller than the box
        {{0, 20, 0, 20}, {0, 20, 0, 20}, 1, 0.4f, {}},         // radius 0
    };
    uint32_t seed = 1;
    for (const BlurCase& c : cases) {
        Block src = makeBlock(c.outer, c.inner, c.sampling);
        fillRandom(src, seed++, -100, 70000);
        Block fast = makeBlock(c.outer, c.inner, c.sampling), ref = makeBlock(c.outer, c.inner, c.sampling);
        fillRandom(fast, 99);
        ref.mem = fast.mem;
        src->blurLarge(c.sigma, fast.get(), c.margin);
        referenceBlurLarge(src.get(), c.sigma, ref.get(), c.margin);
        EXPECT_EQ(fast.mem, ref.mem) << "sigma " << c.sigma << " sampling " << c.sampling;
        EXPECT_EQ(src->innerRect, c.inner);
        EXPECT_EQ(fast->innerRect, c.inner);
    }
}

TEST_F(Ops, BlurLargeKeepsUniformBlocks) {
    for (float sigma : {2.5f, 3.0f, 6.0f, 6.5f, 17.9f, 1e9f}) {
        for (int32_t v : {0, 1, 255, 32767, 65534, 65535}) {
            for (int32_t s : {1, 2}) {
                Block src = makeBlock({0, 40, 0, 40}, {-10, 50, 5, 35}, s);
                std::fill(src.mem.begin(), src.mem.end(), v);
                Block dst = copyOf(src);
                src->blurLarge(sigma, dst.get());
                for (int32_t x : dst.mem) ASSERT_EQ(x, v) << "sigma " << sigma << " s " << s;
            }
        }
    }
}

// An impulse shows the box: support width P (n - 1) + 1, centre weight c^2 of the 1-D kernel.
TEST_F(Ops, BlurLargeBoxWidthAndPasses) {
    struct Case {
        float sigma;
        int32_t support;
        double centre;
    } cases[] = {{2.5f, 13, 19.0 / 125}, {2.9f, 13, 19.0 / 125}, {3.0f, 13, 1.0 / 7}, {3.4f, 13, 1.0 / 7},
                 {3.5f, 19, 37.0 / 343}, {6.0f, 25, 1.0 / 13}, {6.4f, 25, 1.0 / 13}};
    for (const Case& c : cases) {
        Block src = makeBlock({0, 61, 0, 61}, {0, 61, 0, 61});
        const int32_t V = 10000000;
        src.at(30, 30, 0) = V;
        Block dst = copyOf(src);
        src->blurLarge(c.sigma, dst.get());
        int32_t first = -1, last = -1;
        for (int32_t x = 0; x < 61; ++x)
            if (dst.at(x, 30, 0) != 0) {
                if (first < 0) first = x;
                last = x;
            }
        EXPECT_EQ(last - first + 1, c.support) << c.sigma;
        EXPECT_NEAR(dst.at(30, 30, 0), V * c.centre * c.centre, V * c.centre * c.centre * 0.005) << c.sigma;
    }
}

TEST_F(Ops, BlurDispatchSmallSigmaUsesByteKernel) {
    Block src = makeBlock({0, 20, 0, 20}, {0, 20, 0, 20});
    std::fill(src.mem.begin(), src.mem.end(), 1000);  // 1000 >> 8 = 3, scaled back 768
    Block dst = copyOf(src);
    src->blur(1.0, dst.get());
    for (int32_t v : dst.mem) EXPECT_EQ(v, 768);
    src->blur(-5.0, dst.get());  // below 0.2 counts as 0.2
    for (int32_t v : dst.mem) EXPECT_EQ(v, 768);
}

// Brute-force window quantile: rank k is the bin of the k-th smallest sample.
int32_t windowRank(Block& b, int32_t col, int32_t row, int32_t r, int c, int32_t rank, int32_t shift) {
    std::vector<int32_t> v;
    for (int32_t dy = -r; dy <= r; ++dy)
        for (int32_t dx = -r; dx <= r; ++dx)
            v.push_back(std::clamp(b.at(std::clamp(col + dx, 0, b.cols - 1), std::clamp(row + dy, 0, b.rows - 1), c) >> shift, 0,
                                   (1 << (16 - shift)) - 1));
    std::sort(v.begin(), v.end());
    return v[size_t(rank - 1)] << shift;
}

TEST_F(Ops, MedianMatchesBruteForceAtBlockEdges) {
    for (int32_t bits : {6, 8, 9}) {
        Block src = makeBlock({0, 23, 0, 19}, {-4, 27, -3, 22});
        fillRandom(src, 7 + bits, -50, 66000);
        Block dst = copyOf(src);
        src->medianFilter(2, 1 << 20, 1, bits, dst.get());
        const int32_t shift = 16 - bits;
        // Edge pixels are written again for every clamped frame position; the last one wins, so the
        // bottom row and right column hold the window of the frame's last row and column.
        for (int32_t y = 0; y < 19; ++y)
            for (int32_t x = 0; x < 23; ++x) {
                const int32_t fx = x == 22 ? 26 : x, fy = y == 18 ? 21 : y;
                ASSERT_EQ(dst.at(x, y, 1), windowRank(src, fx, fy, 2, 1, 13, shift)) << x << "," << y;
            }
        for (int32_t i = 0; i < int32_t(src.mem.size()); ++i)
            if (i % 3 != 1) {
                ASSERT_EQ(dst.mem[size_t(i)], src.mem[size_t(i)]);
            }
    }
}

TEST_F(Ops, MedianQuantisesAndThresholds) {
    Block src = makeBlock({0, 8, 0, 6}, {0, 8, 0, 6});
    for (int32_t i = 0; i < 8 * 6; ++i) src.mem[size_t(i) * 3] = 1000;
    for (int32_t threshold : {0, 1}) {
        Block dst = copyOf(src);
        src->medianFilter(1, threshold, 0, 8, dst.get());
        for (int32_t y = 0; y < 6; ++y) {
            EXPECT_EQ(dst.at(0, y, 0), 768);  // first of each row, no threshold test
            for (int32_t x = 1; x < 8; ++x) EXPECT_EQ(dst.at(x, y, 0), threshold == 1 ? 768 : 1000);
        }
    }
    // Radius 1 at sampling 2 is below one stored pixel: nothing written.
    Block s2 = makeBlock({0, 8, 0, 8}, {0, 8, 0, 8}, 2);
    fillRandom(s2, 3);
    Block d2 = copyOf(s2);
    s2->medianFilter(1, 255, 0, 8, d2.get());
    EXPECT_EQ(d2.mem, s2.mem);
}

TEST_F(Ops, HistogramsClampOutOfRangeInput) {
    Block src = makeBlock({0, 10, 0, 10}, {0, 10, 0, 10});
    for (int32_t i = 0; i < 100; ++i) src.mem[size_t(i) * 3] = (i % 2) ? -1 : 70000;
    for (int32_t bits : {-3, 0, 12, 40}) {
        Block dst = copyOf(src);
        src->medianFilter(1, 1000, 0, bits, dst.get());
        src->rankRangeFilter(1, 1000, 9, 2, 0, bits, dst.get());
        const int32_t shift = 16 - std::clamp(bits, 6, 9);
        for (int32_t i = 0; i < 100; ++i) {
            const int32_t v = dst.mem[size_t(i) * 3];
            EXPECT_TRUE(v == 0 || v == ((65535 >> shift) << shift) || v == -1 || v == 70000) << v;
        }
    }
    // Radius from the settings text: clamped, finishes, and a flat plane stays flat.
    Block flat = makeBlock({0, 12, 0, 12}, {0, 12, 0, 12});
    std::fill(flat.mem.begin(), flat.mem.end(), 5120);
    Block dst = copyOf(flat);
    flat->medianFilter(1000000, 5, 0, 8, dst.get());
    flat->rankRangeFilter(1000000, 5, 1000000, -1000000, 0, 8, dst.get());
    EXPECT_EQ(dst.mem, flat.mem);
}

TEST_F(Ops, RankRangeHighLowAndMask) {
    // 3 x 3 window, ranks 9 and 2: H the largest, L the second smallest.
    Block src = makeBlock({0, 6, 0, 6}, {0, 6, 0, 6});
    fillRandom(src, 11, 0, 65535);
    for (int32_t t : {0, 10, 300}) {
        Block dst = copyOf(src);
        src->rankRangeFilter(1, t, 2, 9, 2, 8, dst.get());
        for (int32_t y = 0; y < 6; ++y)
            for (int32_t x = 0; x < 6; ++x) {
                const int32_t v = src.at(x, y, 2), Q = windowRank(src, x, y, 1, 2, 5, 8);
                const int32_t H = windowRank(src, x, y, 1, 2, 9, 8), L = windowRank(src, x, y, 1, 2, 2, 8);
                int32_t want = v;
                if (x == 0) want = Q;
                else if ((v <= L || v >= H) && std::abs(v - Q) < t * 256) want = Q;
                ASSERT_EQ(dst.at(x, y, 2), want) << x << "," << y << " t " << t;
            }
    }
    // Mask mode with limit 10: spread below 2560 gives 0, else 65535.
    Block m = makeBlock({0, 12, 0, 3}, {0, 12, 0, 3});
    for (int32_t y = 0; y < 3; ++y)
        for (int32_t x = 0; x < 12; ++x) m.at(x, y, 0) = x < 6 ? 20000 + 256 * (x % 2) : (x % 2) * 30000;
    Block out = copyOf(m);
    m->rankRangeFilter(1, 0, 9, 2, -10, 8, out.get());
    for (int32_t x = 0; x < 12; ++x) {
        const int32_t spread = windowRank(m, x, 1, 1, 0, 9, 8) - windowRank(m, x, 1, 1, 0, 2, 8);
        EXPECT_EQ(out.at(x, 1, 0), spread / 256 < 10 ? 0 : 65535) << x;
    }
    EXPECT_EQ(out.at(1, 1, 0), 0);
    EXPECT_EQ(out.at(9, 1, 0), 65535);
}

TEST_F(Ops, MarginWidensAndIsRestored) {
    Block src = makeBlock({0, 20, 0, 20}, {5, 15, 5, 15});
    std::fill(src.mem.begin(), src.mem.end(), 100);
    Block dst = copyOf(src);
    src->invert(dst.get(), {2, 3});
    EXPECT_EQ(src->innerRect, (cRect{5, 15, 5, 15}));
    EXPECT_EQ(dst->innerRect, (cRect{5, 15, 5, 15}));
    for (int32_t y = 0; y < 20; ++y)
        for (int32_t x = 0; x < 20; ++x) {
            const bool inside = x >= 3 && x < 17 && y >= 2 && y < 18;
            EXPECT_EQ(dst.at(x, y, 0), inside ? 65280 - 100 : 100) << x << "," << y;
        }
}

// The run-split walker against the one-step cursor walk, with a read-modify-write pass in place
// (edge pixels are hit once per clamped position) on frames that stick out of the block.
TEST_F(Ops, FastFrameWalkEqualsCursorWalk) {
    const cRect inners[] = {{-5, 30, -2, 22}, {3, 17, 3, 17}, {-40, -10, 0, 5}, {25, 60, 25, 60}};
    for (int32_t s : {1, 2}) {
        for (const cRect& in : inners) {
            Block a = makeBlock({0, 20, 0, 20}, in, s);
            fillRandom(a, 5);
            Block b = copyOf(a);
            auto op = [](int32_t** p) {
                p[0][0] = (p[0][0] + 2 * p[0][1]) / 3 + 7;
                p[0][2] += 1;
            };
            ops::forEachPixel<1>({a.get()}, op);
            ops::forEachPixel<1, true>({b.get()}, op);
            EXPECT_EQ(a.mem, b.mem);
        }
    }
}

TEST_F(Ops, FillAndInvertOnWorkingBlocks) {
    Block a = makeBlock({0, 4, 0, 4}, {0, 4, 0, 4});
    a->fill(70000, 1, 2);
    for (int32_t i = 0; i < 16; ++i) EXPECT_EQ(a.mem[size_t(i) * 3], 70000);
    a->invert(a.get());
    EXPECT_EQ(a.at(3, 3, 0), 65280 - 70000);
    EXPECT_EQ(a.at(3, 3, 2), 65278);
}

// The 8-bit set on 8-bit blocks, and the base behaviour through a temporary 8-bit copy.
TEST_F(Ops, EightBitOperationsAndBaseCopy) {
    std::vector<uint8_t> mem(4 * 4 * 3), out(4 * 4 * 3, 0);
    const cRect r{0, 4, 0, 4};
    cRGBPixelBlock rgb(mem.data(), r, r, 1, 3, 1, kModeRGB, 12);
    cRGBPixelBlock dst(out.data(), r, r, 1, 3, 1, kModeRGB, 12);
    rgb.fill(10, 20, 30);
    rgb.desaturate(&dst);
    EXPECT_EQ(out[0], 22);
    EXPECT_EQ(out[47], 22);
    rgb.fill(0, 0, 0);
    rgb.invert(&dst);
    EXPECT_EQ(out[5], 255);
    rgb.addUniformNoise(3000000000u, &dst);  // 4 x amount passes 32 bits
    rgb.diffuse(0, &dst);
    EXPECT_EQ(out[7], 0);
    rgb.boostChannel(7, 4000000000u, &dst);

    Block w = makeBlock(r, r);
    for (int32_t i = 0; i < 16; ++i) {
        w.mem[size_t(i) * 3] = 10 * 256;
        w.mem[size_t(i) * 3 + 1] = 20 * 256;
        w.mem[size_t(i) * 3 + 2] = 30 * 256;
    }
    std::fill(out.begin(), out.end(), 0);
    w->desaturate(&dst);  // base: converts to 8-bit RGB, desaturates into dst
    EXPECT_EQ(out[0], 22);
    EXPECT_EQ(out[46], 22);
}

TEST_F(Ops, EightBitFiltersKeepUniformBlocks) {
    std::vector<uint8_t> mem(16 * 16 * 3, 90), out(16 * 16 * 3, 0);
    const cRect r{0, 16, 0, 16};
    cRGBPixelBlock rgb(mem.data(), r, r, 1, 3, 1, kModeRGB, 48);
    cRGBPixelBlock dst(out.data(), r, r, 1, 3, 1, kModeRGB, 48);
    for (double sigma : {0.5, 1.5, 3.0, 8.0}) {
        rgb.blur(sigma, &dst);
        for (uint8_t v : out) ASSERT_EQ(v, 90) << sigma;
    }
    rgb.blurMultiScale(1.0, &dst);
    for (uint8_t v : out) ASSERT_EQ(v, 90);
    rgb.unsharpMask(3, 150, &dst);
    for (uint8_t v : out) ASSERT_EQ(v, 90);
    rgb.highPass(3, &dst);
    for (uint8_t v : out) ASSERT_EQ(v, 128);
    rgb.edgeGradient(&dst);
    for (uint8_t v : out) ASSERT_EQ(v, 0);
    rgb.emboss(45.0, 0.1f, 100, &dst);
    for (uint8_t v : out) ASSERT_EQ(v, 128);
    rgb.embossColor(30.0, 2.0f, 100, &dst);
    for (uint8_t v : out) ASSERT_EQ(v, 90);
    mem[3 * (5 * 16 + 5)] = 190;  // one bright red pixel gives an edge to its left and above
    rgb.edgeGradient(&dst);
    EXPECT_EQ(out[3 * (5 * 16 + 4)], 100);
    EXPECT_EQ(out[3 * (4 * 16 + 5)], 100);
    EXPECT_EQ(out[3 * (5 * 16 + 5)], 200);
}

}  // namespace
