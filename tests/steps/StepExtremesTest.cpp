// Settings that must change nothing, and settings the text can carry but the arithmetic of the steps
// was not made for: each parameter alone at the ends of the int range, mode by mode, on samples that
// include the ends of the int range too. All of them at once, through the module, is the robustness
// tests' sweep; the divisors step 4 can meet at 0 are Step4Test.LevelsWithoutSpanAreLeftOut.
#include <gtest/gtest.h>

#include <algorithm>
#include <functional>
#include <iterator>
#include <typeinfo>
#include <vector>

#include "steps/Step1.h"
#include "steps/Step3.h"
#include "steps/Step4.h"
#include "steps/StepTestSupport.h"
#include "support/StepFields.h"

using namespace steptest;
using KERNEL::cRect;

namespace {

using testsupport::fieldsOf;

// A picture with ordinary samples and, in its first row, the ends of the int range.
Image extremePicture(uint32_t seed) {
    Image img(12, 10, 3, 5);
    img.fillRandom(seed);
    const int32_t ends[] = {kMin, kMax, -1, 65536, 0, 65535};
    for (int32_t i = 0; i < 12; ++i)
        for (int k = 0; k < 3; ++k) img.at(3 + i, 5)[k] = ends[size_t(i + k) % std::size(ends)];
    return img;
}

class StepExtremesTest : public StepTest {
protected:
    // A random picture through a step set up by `set` must come out as it went in.
    template <class Step>
    void expectUnchanged(int32_t mode, const std::function<void(Step&)>& set = {}, int32_t sampling = 1) {
        SCOPED_TRACE(testing::Message() << typeid(Step).name() << " mode " << mode << " sampling " << sampling);
        Step step{nullptr, &host, nullptr, nullptr};
        step.mode = mode;
        if (set) set(step);
        Image img(24, 20, 0, 0, sampling);
        img.fillRandom(uint32_t(mode) + 7);
        auto src = sampling == 1 ? img.block(cRect{3, 21, 2, 18}) : img.block();
        auto dst = runStep(step, src.get(), 2);
        expectSamePixels(*src, *dst);
    }
    // Each field alone at `value`, then all of them, for every mode; clampedModes must stay in range.
    template <class Step>
    void sweep(const std::vector<int32_t>& modes, const std::vector<int32_t>& clampedModes, int32_t border) {
        for (int32_t value : {kMin, kMax}) {
            for (int32_t mode : modes) {
                Step probe{nullptr, &host, nullptr, nullptr};
                const size_t count = fieldsOf(probe).size();
                for (size_t field = 0; field <= count; ++field) {
                    SCOPED_TRACE(testing::Message() << "mode " << mode << " field " << field << " value " << value);
                    Step step{nullptr, &host, nullptr, nullptr};
                    step.mode = mode;
                    auto fields = fieldsOf(step);
                    for (size_t i = 0; i < count; ++i)
                        if (i == field || field == count) *fields[i] = value;
                    Image img = extremePicture(uint32_t(field + 1));
                    auto src = img.block(cRect{4, 14, 6, 14});
                    auto dst = runStep(step, src.get(), border);
                    if (std::find(clampedModes.begin(), clampedModes.end(), mode) == clampedModes.end()) continue;
                    for (int32_t r = 0; r < img.rows(); ++r)
                        for (int32_t c = 0; c < img.columns(); ++c) {
                            const bool inside = c >= 1 && c < 11 && r >= 1 && r < 9;
                            if (!inside) continue;
                            for (int k = 0; k < 3; ++k) {
                                const int32_t v = storedPixel(*dst, c, r)[size_t(k)];
                                ASSERT_TRUE(v >= 0 && v <= 65535) << c << "," << r << "," << k << ": " << v;
                            }
                        }
                }
            }
        }
    }
};

}  // namespace

TEST_F(StepExtremesTest, SettingsThatChangeNothingHandTheInputOn) {
    // Copy modes and modes without a median.
    for (int32_t mode : {0, 100, 101, 104, 107, 108, 5, 99, -1, kMin}) expectUnchanged<cStep1>(mode);
    for (int32_t preset : {5, -1, kMax}) expectUnchanged<cStep1>(3, [=](cStep1& s) { s.preset3 = preset; });
    // A chroma limit of 0 keeps the input; a percentage above 100 would give a negative limit that
    // pushes the chroma away from the median, and is held at 0 too.
    for (int32_t percent : {100, 101, 150, kMax})
        expectUnchanged<cStep1>(2, [=](cStep1& s) { s.chromaLimitPercent = percent; });
    // A median radius below one stored pixel.
    for (int32_t radius : {0, -5, kMin}) expectUnchanged<cStep1>(1, [=](cStep1& s) { s.medianRadius1 = radius; });
    expectUnchanged<cStep1>(1, [](cStep1& s) { s.medianRadius1 = 1; }, 2);
    for (int32_t mode : {6, -1, 0, 100, kMin, kMax}) expectUnchanged<cStep3>(mode);
    for (int32_t mode : {6, -1, 0, kMin, kMax}) expectUnchanged<cStep4>(mode);
    // Modes 1 to 3 of step 4 at their defaults; mode 3 asks for the filter rectangle once.
    for (int32_t mode : {1, 2, 3}) {
        const int before = host.filterRectCalls;
        expectUnchanged<cStep4>(mode);
        EXPECT_EQ(host.filterRectCalls - before, mode == 3 ? 1 : 0);
    }
    // An empty processing rectangle.
    Image img(16, 16);
    img.fillRandom(4);
    cStep1 step{nullptr, &host, nullptr, nullptr};
    step.mode = 4;
    auto src = img.block(cRect{5, 5, 7, 7});
    expectSamePixels(*src, *runStep(step, src.get()));
}

TEST_F(StepExtremesTest, Step1EveryParameterAtTheEndsOfTheRange) {
    sweep<cStep1>({1, 2, 3, 4, 5, 100, 102, 105, 108, kMin, kMax}, {}, 10);
}

TEST_F(StepExtremesTest, Step3EveryParameterAtTheEndsOfTheRange) {
    sweep<cStep3>({1, 2, 3, 4, 5, 6, -1}, {2, 3, 4, 5}, 0);
}

TEST_F(StepExtremesTest, Step4EveryParameterAtTheEndsOfTheRange) {
    for (cRect filter : {cRect{0, 100, 0, 100}, cRect{0, 20, 32766, 32767}, cRect{0, 20, 32767, -32768}}) {
        SCOPED_TRACE(testing::Message() << "filter rows " << filter.y0 << ".." << filter.y1);
        host.filterRect = filter;
        sweep<cStep4>({1, 2, 3, 4, 5, 6, -1}, {1, 2, 3, 4, 5}, 0);
    }
}
