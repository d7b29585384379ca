// Step 4: the tabulated examples of levels, sine curves and graduated levels; the zero divisors of
// the levels; and modes 4 and 5 (grain, points, tone curves) against the rule with the same draws.
#include <gtest/gtest.h>

#include <cstdlib>
#include <functional>

#include "steps/Step4.h"
#include "steps/StepTestSupport.h"

using namespace steptest;
using KERNEL::cRect;

namespace {

class Step4Test : public StepTest {
protected:
    // The same random picture through two steps; true when they agree everywhere.
    void expectSameOutput(cStep4& a, cStep4& b, uint32_t seed) {
        Image img(16, 12, 0, 40);
        img.fillRandom(seed);
        auto src = img.block();
        auto outA = runStep(a, src.get());
        auto outB = runStep(b, src.get());
        expectSamePixels(*outA, *outB);
    }
};

constexpr Pixel3 kRamp{10000, 20000, 30000};
Pixel3 grey(int32_t v) { return {v, v, v}; }

// The tone parabola of modes 4 and 5: x and x^2 in single precision, the rest in double.
int64_t tone(int64_t amount, int64_t index) {
    const float x = float((double(index) - 512.0) / 512.0);
    const float x2 = x * x;
    const double w = 500.0 - 500.0 * double(x2);
    return int64_t(w * double(float(amount)));
}

}  // namespace

TEST_F(Step4Test, TabulatedExamples) {
    struct Case {
        const char* what;
        int32_t mode;
        std::function<void(cStep4&)> set;
        int32_t row;
        Pixel3 in, out;
        cRect filter = {0, 100, 0, 100};
    };
    const auto none = [](cStep4&) {};
    const auto levels1 = [](int32_t b, int32_t w) {
        return [b, w](cStep4& s) {
            s.blackLevel1 = b;
            s.whiteLevel1 = w;
        };
    };
    const auto curve2 = [](cStep4& s) { s.curveStrength2 = 10; };
    const auto gradient = [](int32_t g, int32_t c) {
        return [g, c](cStep4& s) {
            s.gradientLevel3 = g;
            s.curveStrength3 = c;
        };
    };
    const Case cases[] = {
        {"levels 40/40", 1, levels1(40, 40), 0, grey(32768), grey(32928)},
        {"levels 40/0", 1, levels1(40, 0), 0, kRamp, {5883, 16303, 26723}},
        {"levels default", 1, none, 0, kRamp, kRamp},
        {"curve 10, 16384", 2, curve2, 0, grey(16384), grey(15785)},
        {"curve 10, 49152", 2, curve2, 0, grey(49152), grey(49751)},
        {"curve 10, 32768", 2, curve2, 0, grey(32768), grey(32768)},
        {"curve 10, ramp", 2, curve2, 0, kRamp, {9443, 19458, 29536}},
        {"gradient 40, row 0", 3, gradient(40, 0), 0, grey(32768), grey(26784)},
        {"gradient 40, row 50", 3, gradient(40, 0), 50, grey(32768), grey(32928)},
        {"gradient 40, row 100", 3, gradient(40, 0), 100, grey(32768), grey(38816)},
        {"gradient 40, row 0, ramp", 3, gradient(40, 0), 0, kRamp, {0, 11659, 28655}},
        {"inverted curve 10", 3, gradient(0, 10), 0, grey(16384), grey(16983)},
        // Rows are graded by image coordinate, not by distance from the rectangle's top.
        {"gradient 40, row 50, rect from 50", 3, gradient(40, 0), 50, grey(32768), grey(32928), {0, 100, 50, 150}},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.what);
        cStep4 step{nullptr, &host, nullptr, nullptr};
        step.mode = c.mode;
        c.set(step);
        host.filterRect = c.filter;
        EXPECT_EQ(runFlat(step, c.in, c.row), c.out);
    }
}

// Black level on the white level leaves the levels no span; they are left out (the identity) and
// the rest of the mode still applies. Each case: mode, settings on both steps, settings that leave
// no span, and whether the flat step has no host (so no filter rectangle).
TEST_F(Step4Test, LevelsWithoutSpanAreLeftOut) {
    struct Case {
        const char* what;
        int32_t mode;
        std::function<void(cStep4&)> both, flat;
        cRect filter = {0, 100, 0, 100};
        bool hostless = false;
    };
    std::vector<Case> cases;
    const auto curve = [](cStep4& s) { s.curveStrength2 = s.curveStrength3 = 10; };
    for (auto [black, white] : {std::pair{512, 0}, {0, 512}, {256, 256}, {300, 212}, {513, 1}}) {
        cases.push_back({"levels 1", 1, [](cStep4&) {}, [=](cStep4& s) { s.blackLevel1 = black; s.whiteLevel1 = white; }});
        cases.push_back({"levels 2", 2, curve, [=](cStep4& s) { s.blackLevel2 = black; s.whiteLevel2 = white; }});
    }
    cases.push_back({"gradient 256", 3, curve, [](cStep4& s) { s.gradientLevel3 = 256; }});
    cases.push_back({"rectangle of height 0", 3, [](cStep4&) {}, [](cStep4& s) { s.gradientLevel3 = 40; }, {0, 100, 40, 40}});
    cases.push_back({"no host", 3, [](cStep4&) {}, [](cStep4& s) { s.gradientLevel3 = 40; }, {0, 100, 0, 100}, true});
    uint32_t seed = 11;
    for (const Case& c : cases) {
        SCOPED_TRACE(testing::Message() << c.what << " seed " << seed);
        host.filterRect = c.filter;
        cStep4 identity{nullptr, &host, nullptr, nullptr}, flat{nullptr, c.hostless ? nullptr : &host, nullptr, nullptr};
        identity.mode = flat.mode = c.mode;
        c.both(identity);
        c.both(flat);
        c.flat(flat);
        expectSameOutput(flat, identity, seed++);
    }
}

// Modes 4 and 5 against the rule, draw for draw, with the black point K, the factor F and the tone
// amounts worked out by hand from the parameters.
TEST_F(Step4Test, GrainPointsAndTonesMatchTheRule) {
    struct Case {
        const char* what;
        int32_t mode;
        std::function<void(cStep4&)> set;
        int64_t K, F, a[3];
    };
    const auto none = [](cStep4&) {};
    const Case cases[] = {
        {"lift (defaults)", 4, none, 0, 103, {16, 16, 16}},
        {"darken 50", 4, [](cStep4& s) { s.toneSelector4 = 1; }, 2500, 103, {-10, -12, -13}},
        {"lift 0", 4, [](cStep4& s) { s.liftAmount4 = 0; }, 0, 100, {0, 0, 0}},
        {"mode 4, other selector", 4, [](cStep4& s) { s.toneSelector4 = 7; s.toneRed5 = 100; }, 0, 100, {37, 25, 12}},
        {"mode 5 defaults", 5, none, 0, 100, {0, 0, 0}},
        {"red 100", 5, [](cStep4& s) { s.toneRed5 = 100; }, 0, 100, {37, 25, 12}},
        {"points 20/80", 5, [](cStep4& s) { s.blackPoint5 = 20; s.whitePoint5 = 80; }, 5000, 124, {0, 0, 0}},
        // a1 truncates toward zero, a0 and a2 are floored.
        {"red 0, blue 49", 5, [](cStep4& s) { s.toneRed5 = 0; s.toneBlue5 = 49; }, 0, 100, {-38, -25, -13}},
        {"steep points", 5, [](cStep4& s) { s.blackPoint5 = 1; s.whitePoint5 = -63; }, 250, 77100, {0, 0, 0}},
        {"black beyond white", 5, [](cStep4& s) { s.blackPoint5 = 300; }, 75000, -692, {0, 0, 0}},
        {"white point min", 5, [](cStep4& s) { s.whitePoint5 = kMin; }, 0, 0, {0, 0, 0}},
        {"black point max", 5, [](cStep4& s) { s.blackPoint5 = kMax; }, 536870911750, 0, {0, 0, 0}},
        {"tone max", 5, [](cStep4& s) { s.toneRed5 = s.toneBlue5 = kMax; }, 0, 100,
         {2147483597, 2147483597, 2147483597}},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.what);
        cStep4 step{nullptr, &host, nullptr, nullptr};
        step.mode = c.mode;
        c.set(step);
        Image img(19, 13);
        img.fillRandom(31, -500, 66000);
        img.at(0, 0)[0] = kMax;
        img.at(0, 0)[1] = kMin;
        img.at(1, 0)[2] = 65535;
        const unsigned seed = 1234;
        std::srand(seed);
        auto src = img.block();
        auto dst = runStep(step, src.get());

        std::srand(seed);
        for (int32_t y = 0; y < 13; ++y)
            for (int32_t x = 0; x < 19; ++x)
                for (int k = 0; k < 3; ++k) {
                    const int64_t n = std::rand() % 256;
                    int64_t p = ((img.at(x, y)[k] + n - c.K) * c.F) / 100;
                    if (p >= 1 && p <= 65534) {
                        const int64_t t = tone(c.a[k], p >> 6);
                        p += t < kMin ? kMin : (t > kMax ? kMax : t);
                    }
                    const int64_t want = p < 0 ? 0 : (p > 65535 ? 65535 : p);
                    ASSERT_EQ(pixelAt(*dst, x, y)[k], want) << x << "," << y << "," << k;
                }
    }
}
