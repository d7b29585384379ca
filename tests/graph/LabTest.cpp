// The integer Lab conversion: golden values, sampling, rectangles, and the fast path against the
// cursor walk.
#include <gtest/gtest.h>

#include "graph/GraphTestSupport.h"
#include "kernel/Lab.h"

using graphtest::Image;
using KERNEL::cRect;

namespace {

struct Golden {
    int32_t rgb[3];
    int32_t lab[3];
    int32_t back[3];
};

const Golden kGolden[] = {
    // White is checked through the whole bypassed chain.
    {{0, 0, 0}, {0, 32767, 32767}, {0, 22, 22}},
    {{0, 0, 65535}, {10879, -1, -1}, {0, 0, 65493}},
    {{65535, 0, 0}, {21759, 65534, 32767}, {65427, 0, 0}},
    {{0, 65535, 0}, {32639, 32767, 65534}, {0, 65428, 0}},
    {{32768, 32768, 32768}, {32640, 32767, 32767}, {32629, 32662, 32662}},
};

TEST(Lab, GoldenRoundTripThroughTheBlocks) {
    Image image(int32_t(std::size(kGolden)), 1);
    for (size_t i = 0; i < std::size(kGolden); ++i)
        for (int k = 0; k < 3; ++k) image.at(int32_t(i), 0)[k] = kGolden[i].rgb[k];
    Image lab(image.width, 1), back(image.width, 1);
    auto src = image.block();
    auto mid = lab.block();
    auto out = back.block();
    cRGB2LAB().Process(src.get(), mid.get());
    cLAB2RGB().Process(mid.get(), out.get());
    for (size_t i = 0; i < std::size(kGolden); ++i) {
        SCOPED_TRACE(i);
        for (int k = 0; k < 3; ++k) {
            EXPECT_EQ(lab.at(int32_t(i), 0)[k], kGolden[i].lab[k]);
            EXPECT_EQ(back.at(int32_t(i), 0)[k], kGolden[i].back[k]);
        }
    }
}

TEST(Lab, OutOfRangeLabIsConvertedWithoutOverflowAndClamped) {
    struct Case {
        int32_t lab[3];
        int32_t rgb[3];
    };
    const Case cases[] = {
        {{2000000000, 32767, 32767}, {65535, 65535, 65535}},
        {{-2000000000, 32767, 32767}, {0, 0, 0}},
        // a far out: 4a/3 and 2a/3 need more than 32 bits
        {{32767, 2000000000, 32767}, {65535, 0, 0}},
        {{32767, -2000000000, 32767}, {0, 65535, 65535}},
    };
    for (const auto& tc : cases) {
        int32_t r, g, b;
        KERNEL::lab::toRGB(tc.lab[0], tc.lab[1], tc.lab[2], r, g, b);
        EXPECT_EQ(r, tc.rgb[0]);
        EXPECT_EQ(g, tc.rgb[1]);
        EXPECT_EQ(b, tc.rgb[2]);
    }
}

// Reference: the per-pixel cursor walk the design describes, used to check the row fast path.
void referenceWalk(KERNEL::cPixelBlock* src, KERNEL::cPixelBlock* dst, bool forward) {
    const cRect& w = forward ? src->innerRect : dst->innerRect;
    const int32_t s = forward ? src->sampling : dst->sampling;
    KERNEL::cPixel a, d;
    for (int32_t y = w.y0; y < w.y1; y += s) {
        src->getPixel(a, src->innerRect.x0, y);
        dst->getPixel(d, dst->innerRect.x0, y);
        for (int32_t x = w.x0; x < w.x1; x += s) {
            int32_t o[3];
            if (forward)
                KERNEL::lab::toLab(a.s32(0), a.s32(1), a.s32(2), o[0], o[1], o[2]);
            else
                KERNEL::lab::toRGB(a.s32(0), a.s32(1), a.s32(2), o[0], o[1], o[2]);
            for (int k = 0; k < 3; ++k) d.s32(k) = o[k];
            a.right();
            d.right();
        }
    }
}

TEST(Lab, RectanglesPastTheStoredEdgeAndSamplingTwoMatchTheCursorWalk) {
    // Inner rectangles inside, equal to, and widened past the stored one (as node borders do), and
    // an empty one that must leave the block untouched; at sampling 2 the 12 x 10 stored pixels stand
    // for 24 x 20 image pixels, each visited once.
    struct Case {
        int32_t sampling;
        cRect inner;
    };
    const Case cases[] = {{1, {3, 9, 2, 7}},   {1, {0, 12, 0, 10}}, {1, {-4, 16, -3, 13}}, {1, {5, 5, 0, 10}},
                          {1, {0, 1, 0, 1}},   {2, {0, 24, 0, 20}}, {2, {-4, 30, -2, 24}}};
    for (bool forward : {true, false}) {
        for (const Case& c : cases) {
            const cRect& inner = c.inner;
            SCOPED_TRACE(testing::Message() << forward << " sampling " << c.sampling << " " << inner.x0 << "," << inner.x1);
            const int32_t w = 12 * c.sampling, h = 10 * c.sampling;
            Image in(w, h, 0, 0, c.sampling);
            in.fillRandom(3, forward ? 0 : -70000, forward ? 65535 : 140000);
            Image fast(w, h, 0, 0, c.sampling), slow(w, h, 0, 0, c.sampling);
            fast.fillRandom(4);
            slow.samples = fast.samples;
            auto src = in.block(inner);
            auto a = fast.block(inner);
            auto b = slow.block(inner);
            if (forward)
                cRGB2LAB().Process(src.get(), a.get());
            else
                cLAB2RGB().Process(src.get(), a.get());
            referenceWalk(src.get(), b.get(), forward);
            EXPECT_EQ(fast.samples, slow.samples);
        }
    }
}

}  // namespace
