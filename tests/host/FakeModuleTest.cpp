// A real module file loaded from disk (the fake filter), run through the whole protocol.
#include <gtest/gtest.h>

#include "TestSupport.h"
#include "noctiva/host/Error.h"
#include "noctiva/host/Module.h"
#include "noctiva/host/Session.h"

using namespace noctiva::host;

namespace {

const Module& fakeModule() {
    static const Module module(FAKE_MODULE_PATH);
    return module;
}

RunResult runFake(Image& image, const std::string& orders, RunOptions options = {}) {
    options.par1 = orders;
    options.failOnLeak = true;
    return runFilter(fakeModule().entry(), image, options);
}

Image inverted(const Image& image, std::optional<Selection> selection = std::nullopt) {
    Image out = image;
    const Selection s = selection.value_or(Selection{0, 0, image.width, image.height});
    for (int y = s.y; y < s.y + s.height; ++y)
        for (int x = s.x; x < s.x + s.width; ++x)
            for (int p = 0; p < 3; ++p) out.set(x, y, p, std::uint16_t(image.maxValue() - image.at(x, y, p)));
    return out;
}

struct TilingCase {
    int width, height, channels, depth;
    std::string orders;
    std::optional<Selection> selection;
};

class FakeTiling : public ::testing::TestWithParam<TilingCase> {};

// Tiles, margins, padding and selections must not show in the result: every pixel is inverted
// exactly once and alpha is carried through.
TEST_P(FakeTiling, ResultIsIndependentOfTheTiling) {
    const TilingCase& c = GetParam();
    Image image = hosttest::patternImage(c.width, c.height, c.channels, c.depth);
    const Image expected = inverted(image, c.selection);
    RunOptions options;
    options.selection = c.selection;
    const RunResult result = runFake(image, c.orders, options);
    ASSERT_TRUE(result.ok()) << result.message();
    EXPECT_EQ(image, expected);
    EXPECT_FALSE(result.leaks.any());
    EXPECT_EQ(result.par1Out.rfind("tiles=", 0), 0u) << result.par1Out;
}

INSTANTIATE_TEST_SUITE_P(
    Host, FakeTiling,
    ::testing::Values(TilingCase{1, 1, 3, 8, "tile=0", {}}, TilingCase{23, 17, 3, 8, "tile=5 margin=2", {}},
                      TilingCase{23, 17, 4, 8, "tile=5 margin=2 inpad=0", {}},
                      TilingCase{23, 17, 4, 16, "tile=7 margin=3 outmargin=1", {}},
                      TilingCase{9, 8, 3, 16, "tile=8 margin=1 inpad=255 outpad=-2", {}},
                      TilingCase{31, 13, 3, 8, "tile=4 margin=2 outmargin=1", Selection{3, 2, 17, 9}},
                      TilingCase{31, 13, 4, 16, "tile=6 margin=5", Selection{30, 12, 1, 1}},
                      TilingCase{20, 11, 3, 8, "tile=3 advance=1", {}},
                      TilingCase{20, 11, 4, 16, "tile=3 margin=1 advance=1", Selection{1, 1, 18, 9}},
                      TilingCase{12, 12, 3, 8, "tile=5 margin=1 buffer=64", {}}));

TEST(FakeModule, ModuleErrorCodesAreReportedWithTheirMeaning) {
    Image image = hosttest::patternImage(4, 4, 3, 8);
    const RunResult result = runFake(image, "fail=-30100");
    EXPECT_EQ(result.result, pi::filterBadParameters);
    EXPECT_EQ(result.failedSelector, "Continue");
    EXPECT_EQ(result.message(), "module failed in Continue with -30100 (bad filter parameters)");
}

TEST(FakeModule, ColourServicesAreCountedAndRoundTrip) {
    Image image = hosttest::patternImage(8, 8, 3, 8);
    const RunResult result = runFake(image, "tile=4 color=1");
    ASSERT_TRUE(result.ok()) << result.message();
    EXPECT_EQ(result.colorServiceCalls, 8);
    EXPECT_NE(result.par1Out.find("colors=4 "), std::string::npos) << result.par1Out;
}

TEST(Module, LoadFailuresNameTheFile) {
    try {
        Module missing("/nonexistent/Noctiva.so");
        FAIL() << "loaded a missing file";
    } catch (const HostError& e) {
        EXPECT_EQ(e.subject(), "/nonexistent/Noctiva.so");
        EXPECT_NE(e.reason().find("cannot load module"), std::string::npos);
    }
    try {
        Module wrongEntry(FAKE_MODULE_PATH, "PluginMain");
        FAIL() << "found an entry that does not exist";
    } catch (const HostError& e) {
        EXPECT_NE(e.reason().find("PluginMain"), std::string::npos) << e.what();
    }
}

}  // namespace
