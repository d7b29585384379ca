// Host memory that fails at every single point of a run: the N-th handle allocation, buffer
// allocation or buffer lock, for every N a clean run reaches. Each such run must end with the
// out-of-memory code, give back every handle and buffer, and leave the host's image as it was.
#include <gtest/gtest.h>

#include <optional>
#include <string>

#include "host/TestSupport.h"
#include "noctiva/host/Session.h"
#include "robustness/RobustnessSupport.h"

using namespace noctiva::host;

namespace {

struct RunCase {
    const char* name;
    int width, height, channels, depth;
    std::optional<std::string> par1;
};

struct Fault {
    const char* name;
    int RunOptions::*failAt;
    long RunResult::*count;
};

const Fault kFaults[] = {
    {"handle allocation", &RunOptions::failHandleAllocation, &RunResult::handleAllocations},
    {"buffer allocation", &RunOptions::failBufferAllocation, &RunResult::bufferAllocations},
    {"buffer lock", &RunOptions::failBufferLock, &RunResult::bufferLocks},
};

// Several tiles (they are 200 pixels with a margin of 50), so failures also hit later tiles.
const RunCase kRuns[] = {
    {"default", 260, 230, 3, 8, std::nullopt},
    {"every_step", 260, 230, 4, 16,
     robustness::settingsWith({{robustness::kStep1Mode, 4},
                               {robustness::kStep2Mode, 9},
                               {robustness::kStep3Mode, 2},
                               {robustness::kStep4Mode, 2}})},
};

class FaultSweep : public ::testing::TestWithParam<RunCase> {};

TEST_P(FaultSweep, EveryFailingAllocationAndLockEndsCleanly) {
    const RunCase& run = GetParam();
    const Image original = hosttest::patternImage(run.width, run.height, run.channels, run.depth, 7);
    RunOptions base;
    base.par1 = run.par1;
    base.failOnLeak = true;
    base.parentWindow = false;

    Image clean = original;
    const RunResult reference = runFilter(robustness::noctivaModule().entry(), clean, base);
    ASSERT_TRUE(reference.ok()) << reference.message();
    ASSERT_NE(clean, original) << "the run must process something for the sweep to mean anything";

    long casesRun = 0;
    for (const Fault& fault : kFaults) {
        const long total = reference.*fault.count;
        if (fault.count != &RunResult::bufferLocks) {
            EXPECT_GT(total, 0) << fault.name;
        }
        for (long n = 1; n <= total; ++n) {
            SCOPED_TRACE(std::string(fault.name) + " " + std::to_string(n) + " of " + std::to_string(total));
            RunOptions options = base;
            options.*fault.failAt = int(n);
            Image image = original;
            const RunResult result = runFilter(robustness::noctivaModule().entry(), image, options);
            ++casesRun;
            EXPECT_EQ(result.result, pi::memFullErr) << result.message();
            EXPECT_TRUE(result.hostError.empty()) << result.hostError;
            EXPECT_FALSE(result.leaks.any()) << result.leaks.describe();
            EXPECT_EQ(result.protocolWarnings, 0);
            EXPECT_TRUE(image == original) << "a failed run leaves the image untouched";
            if (::testing::Test::HasFailure()) return;  // one broken point is enough to read
        }
        // One past the last: nothing fails, and the run is the clean one.
        RunOptions options = base;
        options.*fault.failAt = int(total + 1);
        Image image = original;
        const RunResult result = runFilter(robustness::noctivaModule().entry(), image, options);
        EXPECT_TRUE(result.ok()) << fault.name << ": " << result.message();
        EXPECT_TRUE(image == clean) << fault.name;
    }
    RecordProperty("cases", std::to_string(casesRun));
    std::printf("[ sweep    ] %s: %ld handle allocations, %ld buffer allocations, %ld buffer locks, %ld failing runs\n",
                run.name, reference.handleAllocations, reference.bufferAllocations, reference.bufferLocks, casesRun);
}

INSTANTIATE_TEST_SUITE_P(Module, FaultSweep, ::testing::ValuesIn(kRuns),
                         [](const auto& info) { return std::string(info.param.name); });

// The host's side of the rule, with a module that stores a tile and then fails: the stored tile
// must not reach the caller.
TEST(FailedRun, TilesStoredBeforeAFailureAreTakenBack) {
    const Image original = hosttest::patternImage(30, 20, 3, 8);
    bool failSecondTile = true;
    int continues = 0;
    hosttest::script() = [&](pi::int16 selector, pi::FilterRecord* r, intptr_t*, pi::int16* result) {
        if (selector == pi::filterSelectorStart) {
            continues = 0;
            r->outRect = {0, 0, 10, 30};
            r->outLoPlane = 0;
            r->outHiPlane = 2;
        } else if (selector == pi::filterSelectorContinue) {
            if (++continues == 1) {
                auto* out = static_cast<std::uint8_t*>(r->outData);
                for (int y = 0; y < 10; ++y)
                    for (int x = 0; x < 30 * 3; ++x) out[y * r->outRowBytes + x] = 0;
                r->outRect = {10, 0, 20, 30};  // the second half next
            } else {
                if (failSecondTile) *result = pi::memFullErr;
                r->outRect = {};
            }
        }
    };
    RunOptions options;
    options.parentWindow = false;
    Image image = original;
    const RunResult result = runFilter(&hosttest::scriptedEntry, image, options);
    EXPECT_EQ(result.result, pi::memFullErr);
    EXPECT_EQ(continues, 2);
    EXPECT_TRUE(image == original) << "the first half was stored, then taken back";

    // The same module without the failure keeps what it wrote.
    failSecondTile = false;
    Image kept = original;
    const RunResult succeeded = runFilter(&hosttest::scriptedEntry, kept, options);
    EXPECT_TRUE(succeeded.ok()) << succeeded.message();
    EXPECT_EQ(kept.at(0, 0, 0), 0);
    EXPECT_EQ(kept.at(29, 9, 2), 0);
    EXPECT_EQ(kept.at(0, 15, 0), original.at(0, 15, 0));
    hosttest::script() = nullptr;
}

}  // namespace
