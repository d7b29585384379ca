// Tiles through our host: the requested rectangles, and the tiled result against the same chain evaluated over the whole image
// as one tile: the 50-pixel margins must hide every tile edge, whatever the stages.
#include <gtest/gtest.h>

#include <cstring>
#include <map>
#include <optional>
#include <vector>
#include <memory>
#include <string>

#include "host/TestSupport.h"
#include "kernel/FilterAction.h"
#include "kernel/PixelBlock.h"
#include "noctiva/host/Session.h"
#include "steps/ShadowChain.h"
#include "steps/Step1.h"
#include "steps/Step2.h"
#include "steps/Step3.h"
#include "steps/Step4.h"
#include "support/MallocHost.h"
#include "support/NoctivaModule.h"

using namespace noctiva::host;

namespace {

// The whole image as one tile through the kernel: the chain sees the image's edges on every side and
// no tile edge anywhere.
Image wholeImageAsOneTile(const Image& in, const std::string& text) {
    testsupport::MallocHost memory;
    memory.filterRect = {0, int16_t(in.width), 0, int16_t(in.height)};
    KERNEL::initModeTables();
    std::unique_ptr<cRGB32FilterAction> action(buildShadowAction(new cStep1(nullptr, &memory, nullptr, nullptr),
                                                                 new cStep2(nullptr, &memory, nullptr, nullptr),
                                                                 new cStep3(nullptr, &memory, nullptr, nullptr),
                                                                 new cStep4(nullptr, &memory, nullptr, nullptr)));
    action->ReadParameters(text.c_str() + 4);
    const uint32_t bytes = in.depth == 16 ? 2 : 1;
    const uint16_t mode = in.depth == 16 ? KERNEL::kModeRGB16 : KERNEL::kModeRGB;
    const uint32_t rowBytes = uint32_t(in.width * in.channels) * bytes;
    std::vector<uint8_t> src(size_t(rowBytes) * size_t(in.height)), dst;
    if (bytes == 1) src = in.samples8;
    else std::memcpy(src.data(), in.samples16.data(), src.size());
    dst = src;
    std::unique_ptr<KERNEL::cPixelBlock> source(KERNEL::cPixelBlock::create(
        src.data(), in.width, in.height, bytes, uint32_t(in.channels) * bytes, 0, 1, mode, rowBytes, 0, 0));
    std::unique_ptr<KERNEL::cPixelBlock> destination(KERNEL::cPixelBlock::create(
        dst.data(), in.width, in.height, bytes, uint32_t(in.channels) * bytes, 0, 1, mode, rowBytes, 0, 0));
    action->Apply(source.get(), destination.get());
    action.reset();
    EXPECT_EQ(memory.liveBuffers(), 0u);
    Image out = in;
    if (bytes == 1) out.samples8 = dst;
    else std::memcpy(out.samples16.data(), dst.data(), dst.size());
    return out;
}

struct Setting {
    const char* name;
    std::map<int, std::int32_t> overrides;  // parameter number -> value
};
std::ostream& operator<<(std::ostream& os, const Setting& s) { return os << s.name; }

class Seams : public ::testing::TestWithParam<Setting> {};

TEST_P(Seams, TiledRunEqualsOneTileOverTheWholeImage) {
    const std::string text = testsupport::settingsWith(GetParam().overrides);
    // 613 x 457 is three tiles each way, the last ones of odd size.
    for (int depth : {8, 16}) {
        Image tiled = hosttest::patternImage(613, 457, 3, depth, 7);
        const Image input = tiled;
        const Image whole = wholeImageAsOneTile(tiled, text);
        RunOptions options;
        options.par1 = text;
        options.failOnLeak = true;
        const RunResult r = runFilter(testsupport::noctivaModule().entry(), tiled, options);
        ASSERT_TRUE(r.ok()) << r.message();
        EXPECT_EQ(r.tilesServed, 9) << "three rows of three tiles";
        size_t differing = 0;
        for (size_t i = 0; i < whole.sampleCount(); ++i) differing += whole.sample(i) != tiled.sample(i);
        EXPECT_EQ(differing, 0u) << depth << "-bit";
        EXPECT_NE(tiled, input) << "the stages must have changed the image for the comparison to mean anything";
    }
}

// Step 2's modes (number 50) and step 1's grid smoothing (number 57), the widest borders included.
INSTANTIATE_TEST_SUITE_P(Stages, Seams,
                         ::testing::Values(Setting{"defaults", {}}, Setting{"blur100", {{50, 100}}},
                                           Setting{"blur101", {{50, 101}}}, Setting{"chroma107", {{50, 107}}},
                                           Setting{"wide108", {{50, 108}}}, Setting{"impulse1", {{50, 1}}},
                                           Setting{"median2", {{50, 2}}}, Setting{"rank3", {{50, 3}}},
                                           Setting{"blend4", {{50, 4}}}, Setting{"light5", {{50, 5}}},
                                           Setting{"grid1mode4", {{57, 4}, {50, 104}}},
                                           Setting{"wavelet105", {{50, 105}}}),
                         [](const auto& info) { return std::string(info.param.name); });


// The padded spans of the tiling rule along each axis, written out by hand: 200-pixel cores with
// 50 pixels of margin towards each neighbour; a remainder of at most 250 pixels is the last tile.
// Rows are walked top to bottom, and each row from the left edge of the area.
struct Geometry {
    int width, height;
    std::optional<Selection> selection;
    std::vector<std::pair<int, int>> columns, rows;
};

TEST(Tiles, TheHostIsAskedForExactlyTheTilesRowByRowAndProgressEndsComplete) {
    using Spans = std::vector<std::pair<int, int>>;
    const Spans w1031 = {{0, 250}, {150, 450}, {350, 650}, {550, 850}, {750, 1031}};
    const Geometry cases[] = {
        {1, 1, {}, {{0, 1}}, {{0, 1}}},
        {251, 250, {}, {{0, 250}, {150, 251}}, {{0, 250}}},
        {450, 451, {}, {{0, 250}, {150, 450}}, {{0, 250}, {150, 450}, {350, 451}}},
        {1031, 37, {}, w1031, {{0, 37}}},
        // A selection is tiled from its own corner.
        {700, 520, Selection{13, 37, 451, 260}, {{13, 263}, {163, 463}, {363, 464}}, {{37, 287}, {187, 297}}},
    };
    for (const auto& g : cases) {
        Image image = hosttest::patternImage(g.width, g.height, 3, 8, 3);
        RunOptions options;
        options.selection = g.selection;
        const RunResult r = runFilter(testsupport::noctivaModule().entry(), image, options);
        ASSERT_TRUE(r.ok()) << r.message();
        std::vector<pi::Rect16> expected;
        for (const auto& [top, bottom] : g.rows)
            for (const auto& [left, right] : g.columns)
                expected.push_back({int16_t(top), int16_t(left), int16_t(bottom), int16_t(right)});
        ASSERT_EQ(r.requestedInRects.size(), expected.size()) << g.width << " x " << g.height;
        for (size_t i = 0; i < expected.size(); ++i) {
            const auto& a = r.requestedInRects[i];
            const auto& e = expected[i];
            EXPECT_TRUE(a.top == e.top && a.left == e.left && a.bottom == e.bottom && a.right == e.right)
                << "tile " << i << ": got (" << a.top << "," << a.left << "," << a.bottom << "," << a.right
                << ") expected (" << e.top << "," << e.left << "," << e.bottom << "," << e.right << ")";
        }
        ASSERT_FALSE(r.progress.empty());
        EXPECT_EQ(r.progress.back().first, r.progress.back().second) << "progress reaches done = total";
    }
}

}  // namespace
