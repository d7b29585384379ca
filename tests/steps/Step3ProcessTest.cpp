// Step 3: the tabulated colour examples of modes 1 to 4, the pixel walk at sampling 2
// and inside a partial rectangle, and mode 5's toned grain at worked values for every selector.
#include <gtest/gtest.h>

#include <cstdlib>
#include <functional>
#include <iterator>

#include "steps/Step3.h"
#include "steps/StepTestSupport.h"

using namespace steptest;
using KERNEL::cRect;

namespace {

class Step3Test : public StepTest {
protected:
    cStep3 step{nullptr, &host, nullptr, nullptr};
};

constexpr Pixel3 kGrey{32768, 32768, 32768};
constexpr Pixel3 kBlack{0, 0, 0};
constexpr Pixel3 kWhite{65535, 65535, 65535};
constexpr Pixel3 kRamp{10000, 20000, 30000};

}  // namespace

TEST_F(Step3Test, TabulatedExamples) {
    struct Case {
        const char* what;
        int32_t mode;
        std::function<void(cStep3&)> set;
        Pixel3 in, out;
    };
    const auto none = [](cStep3&) {};
    const Case cases[] = {
        {"grade, grey", 1, none, kGrey, {33549, 32782, 32547}},
        {"grade 100, grey", 1, [](cStep3& s) { s.gradeMix = 100; }, kGrey, {36676, 32842, 31663}},
        {"grade, white", 1, none, kWhite, kWhite},
        {"grade, black", 1, none, kBlack, {45, 0, 0}},
        {"grade 0", 1, [](cStep3& s) { s.gradeMix = 0; }, kRamp, kRamp},
        {"warm 200", 2, [](cStep3& s) { s.warmthPercent = 200; }, kGrey, {40448, 33792, 24064}},
        {"saturation 0", 2, [](cStep3& s) { s.saturationPercent = 0; }, kRamp, {20000, 20000, 20000}},
        {"saturation 200", 2, [](cStep3& s) { s.saturationPercent = 200; }, kRamp, {0, 20000, 40000}},
        {"saturation defaults", 2, none, kRamp, kRamp},
        {"shift 3, grey", 3, none, kGrey, {41968, 37968, 23968}},
        {"shift 3, black", 3, none, kBlack, {2921, 1651, 0}},
        {"shift 3, white", 3, none, kWhite, {65535, 65535, 62693}},
        {"shift 4, grey", 4, none, kGrey, {23568, 27568, 41568}},
        {"shift 3, strength 0", 3, [](cStep3& s) { s.shiftStrength3 = 0; }, kRamp, kRamp},
        // Products far beyond 32 bits saturate into the clamp instead of wrapping.
        {"shift 3, strength max", 3, [](cStep3& s) { s.shiftStrength3 = kMax; }, kGrey, {65535, 65535, 0}},
        {"shift 4, strength min", 4, [](cStep3& s) { s.shiftStrength4 = kMin; }, kGrey, {65535, 65535, 0}},
        {"shift 3, level max", 3, [](cStep3& s) { s.shiftLevelB3 = kMax; }, kBlack, {2921, 1651, 65535}},
        {"saturation max", 2, [](cStep3& s) { s.saturationPercent = kMax; }, kRamp, {0, 20000, 65535}},
        {"warm min", 2, [](cStep3& s) { s.warmthPercent = kMin; }, kGrey, {0, 0, 65535}},
        // An unclamped grade that leaves the int range is held at its end.
        {"grade max", 1, [](cStep3& s) { s.gradeMix = kMax; }, kGrey, {kMax, 1589170666, kMin}},
        {"grade min, extremes", 1, [](cStep3& s) { s.gradeMix = kMin; }, {kMax, 0, 65535}, {kMax, 0, kMax}},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.what);
        cStep3 fresh{nullptr, &host, nullptr, nullptr};
        fresh.mode = c.mode;
        c.set(fresh);
        EXPECT_EQ(runFlat(fresh, c.in), c.out);
    }
}

// At sampling 2 the walk steps two image pixels, i.e. one stored pixel; pixels outside the
// processing rectangle keep the copied input.
TEST_F(Step3Test, WalkCoversExactlyTheProcessingRectangle) {
    step.mode = 3;
    struct Case {
        int32_t sampling;
        cRect inner;
        int32_t c0, c1, r0, r1;  // stored columns and rows expected to change
    };
    const Case cases[] = {{2, {4, 12, 2, 10}, 2, 6, 1, 5}, {1, {3, 9, 2, 5}, 3, 9, 2, 5}, {2, {6, 6, 0, 16}, 0, 0, 0, 0}};
    for (const Case& c : cases) {
        SCOPED_TRACE(testing::Message() << "sampling " << c.sampling);
        Image img(16, 16, 0, 0, c.sampling);
        img.fill(32768, 32768, 32768);
        auto src = img.block(c.inner);
        auto dst = runStep(step, src.get());
        for (int32_t r = 0; r < img.rows(); ++r)
            for (int32_t col = 0; col < img.columns(); ++col) {
                const bool inside = col >= c.c0 && col < c.c1 && r >= c.r0 && r < c.r1;
                const Pixel3 want = inside ? Pixel3{41968, 37968, 23968} : kGrey;
                ASSERT_EQ(storedPixel(*dst, col, r), want) << col << "," << r;
            }
    }
}

// Inputs chosen from the draws the step will make, so that sample + grain lands on a chosen value:
// the toning parabola's peak (index 512: 500 times the amount), index 100 (176.239013671875 times the
// amount, truncated toward zero), the ends (no toning), beyond white and the ends of the int range
// (clamped). Each selector's amounts at tone amounts of 70, worked out by hand: weights (20, 10, -20),
// (20, -24, 26), (-20, 24, -26), (-20, -10, 20) times 70 / 100, truncated; other selectors tone nothing.
TEST_F(Step3Test, GrainLandsOnChosenTableEntries) {
    struct Case {
        int32_t selector;
        Pixel3 peak, at100;
    };
    const Case cases[] = {
        {0, {7000, 3500, -7000}, {2467, 1233, -2467}},   {1, {7000, -8000, 9000}, {2467, -2819, 3172}},
        {2, {-7000, 8000, -9000}, {-2467, 2819, -3172}}, {3, {-7000, -3500, 7000}, {-2467, -1233, 2467}},
        {-1, {0, 0, 0}, {0, 0, 0}},                      {4, {0, 0, 0}, {0, 0, 0}},
        {kMin, {0, 0, 0}, {0, 0, 0}},                    {kMax, {0, 0, 0}, {0, 0, 0}},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.selector);
        struct Target {
            Pixel3 value, out;
            bool drawn = true;  // false: the input itself, whatever the draw adds
        };
        Pixel3 peak, at100;
        for (size_t k = 0; k < 3; ++k) peak[k] = 32768 + c.peak[k], at100[k] = 6400 + c.at100[k];
        const Target targets[] = {
            {{32768, 32768, 32768}, peak},         {{6400, 6400, 6400}, at100},
            {{0, 0, 0}, {0, 0, 0}},                {{65535, 65535, 65535}, {65535, 65535, 65535}},
            {{1, 1, 1}, {1, 1, 1}},  // entry 0 is 0
            {{65600, 70000, 66000}, {65535, 65535, 65535}},
            {{kMax, kMin, kMax}, {65535, 0, 65535}, false},
        };
        step.mode = 5;
        step.toneSelector = c.selector;
        step.toneAmount0 = step.toneAmount1 = step.toneAmount2 = step.toneAmount3 = 70;
        const unsigned seed = 4242;
        const int32_t n = int32_t(std::size(targets));
        Image img(n, 1);
        std::srand(seed);
        for (int32_t i = 0; i < n; ++i)
            for (size_t k = 0; k < 3; ++k) {
                const int32_t draw = std::rand() % 256;
                img.at(i, 0)[k] = targets[i].drawn ? targets[i].value[k] - draw : targets[i].value[k];
            }
        std::srand(seed);
        auto src = img.block();
        auto dst = runStep(step, src.get());
        for (int32_t i = 0; i < n; ++i) EXPECT_EQ(pixelAt(*dst, i, 0), targets[i].out) << "target " << i;
    }
}
