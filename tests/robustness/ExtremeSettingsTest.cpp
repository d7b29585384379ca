// No settings value may make a run unbounded: every parameter at INT32_MIN, then at INT32_MAX,
// with each mode of each step in turn (the other steps bypassed), over a 400 x 300 crop of the
// sample photograph. Each run must end cleanly; the test's time-out catches one that does not end.
#include <gtest/gtest.h>

#include <chrono>
#include <climits>
#include <cstdio>
#include <string>
#include <vector>

#include "noctiva/host/Session.h"
#include "robustness/RobustnessSupport.h"

using namespace noctiva::host;

namespace {

struct StepModes {
    int step;
    int modeParameter;
    std::vector<std::int32_t> modes;
};

const StepModes kSteps[] = {
    {1, robustness::kStep1Mode, {1, 2, 3, 4, 105}},
    {2, robustness::kStep2Mode, {1, 2, 3, 4, 5, 6, 7, 8, 9, 100, 101, 102, 103, 104, 105, 106, 107, 108}},
    {3, robustness::kStep3Mode, {1, 2, 3, 4, 5}},
    {4, robustness::kStep4Mode, {1, 2, 3, 4, 5}},
};

bool isMode(int number) {
    return number == robustness::kStep1Mode || number == robustness::kStep2Mode ||
           number == robustness::kStep3Mode || number == robustness::kStep4Mode;
}

void expectCleanRun(const std::string& par1, const Image& original, double& slowest, std::string& slowestName,
                    const std::string& name) {
    SCOPED_TRACE(name);
    Image image = original;
    RunOptions options;
    options.par1 = par1;
    options.failOnLeak = true;
    options.parentWindow = false;
    const auto start = std::chrono::steady_clock::now();
    const RunResult result = runFilter(robustness::noctivaModule().entry(), image, options);
    const double seconds = std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
    if (seconds > slowest) slowest = seconds, slowestName = name;
    EXPECT_TRUE(result.ok()) << result.message();
    EXPECT_FALSE(result.leaks.any()) << result.leaks.describe();
    EXPECT_EQ(result.par1Out.rfind("vek ", 0), 0u) << result.par1Out;
}

class ExtremeSettings : public ::testing::TestWithParam<std::int32_t> {};

TEST_P(ExtremeSettings, EveryModeOfEveryStepEndsCleanly) {
    const std::int32_t extreme = GetParam();
    const Image original = robustness::sampleCrop(400, 300);
    double slowest = 0;
    std::string slowestName;
    int runs = 0;
    for (const StepModes& step : kSteps)
        for (const std::int32_t mode : step.modes) {
            const std::string par1 = robustness::settingsText([&](int number, std::int32_t) {
                if (number == step.modeParameter) return mode;
                return isMode(number) ? 0 : extreme;
            });
            expectCleanRun(par1, original, slowest, slowestName,
                           "step " + std::to_string(step.step) + " mode " + std::to_string(mode));
            ++runs;
        }
    // Literally every parameter at the extreme, the modes too (unknown mode numbers).
    expectCleanRun(robustness::settingsText([&](int, std::int32_t) { return extreme; }), original, slowest,
                   slowestName, "all 58 parameters");
    ++runs;
    std::printf("[ extremes ] %d runs at %d; slowest %.2f s (%s)\n", runs, extreme, slowest, slowestName.c_str());
}

INSTANTIATE_TEST_SUITE_P(Module, ExtremeSettings, ::testing::Values(INT32_MIN, INT32_MAX),
                         [](const auto& info) { return info.param < 0 ? std::string("Int32Min") : std::string("Int32Max"); });

}  // namespace
