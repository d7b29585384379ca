// The fused default-chain path and the worker threads must not change one output bit: every run is
// compared pixel for pixel with the same run through the chain's blocks (NOCTIVA_REFERENCE=1, one
// thread), over sizes that hit the tile and border edges, selections at odd offsets, 8 and 16
// bits, with and without alpha.
#include <gtest/gtest.h>

#include <cstdlib>
#include <optional>
#include <random>
#include <string>
#include <vector>

#include "lib/TestFiles.h"
#include "noctiva/host/Session.h"
#include "support/NoctivaModule.h"

using namespace noctiva::host;

namespace {

using testsupport::noctivaModule;

// Smooth ramps, a hard-edged block and noise, so that blur, clamping and edges all show.
Image testImage(int w, int h, int channels, int depth, unsigned seed) {
    Image image(w, h, channels, depth);
    std::mt19937 random(seed);
    const int maxv = image.maxValue();
    for (int y = 0; y < h; ++y)
        for (int x = 0; x < w; ++x)
            for (int c = 0; c < channels; ++c) {
                int v = (x * (c + 1) * 37 + y * 23) % (maxv + 1);
                if (x > w / 3 && x < w / 2 && y > h / 4) v = c == 1 ? maxv : 0;  // saturated block
                const int noise = int(random() % 64) - 32;
                v = std::clamp(v + noise * (depth == 16 ? 128 : 1), 0, maxv);
                if (random() % 97 == 0) v = random() % 2 ? maxv : 0;  // impulses, extremes
                image.set(x, y, c, std::uint16_t(v));
            }
    return image;
}

Image run(const Image& input, const RunOptions& options, bool reference, const std::string& threads) {
    vek::testing::ScopedEnv ref("NOCTIVA_REFERENCE", reference ? "1" : nullptr);
    vek::testing::ScopedEnv thr("NOCTIVA_THREADS", threads.c_str());
    Image image = input;
    const RunResult r = runFilter(noctivaModule().entry(), image, options);
    EXPECT_TRUE(r.ok()) << r.message();
    return image;
}

// First differing sample, for a readable failure.
std::string firstDifference(const Image& a, const Image& b) {
    if (a.width != b.width || a.height != b.height) return "sizes differ";
    for (int y = 0; y < a.height; ++y)
        for (int x = 0; x < a.width; ++x)
            for (int c = 0; c < a.channels; ++c)
                if (a.at(x, y, c) != b.at(x, y, c))
                    return "(" + std::to_string(x) + "," + std::to_string(y) + ") channel " + std::to_string(c) + ": " +
                           std::to_string(a.at(x, y, c)) + " vs " + std::to_string(b.at(x, y, c));
    return "none";
}

struct Shape {
    int width, height, channels, depth;
    std::optional<Selection> selection;
};

std::string name(const Shape& s) {
    std::string n = std::to_string(s.width) + "x" + std::to_string(s.height) + "_c" + std::to_string(s.channels) + "_d" +
                    std::to_string(s.depth);
    if (s.selection)
        n += "_sel" + std::to_string(s.selection->x) + "_" + std::to_string(s.selection->y) + "_" +
             std::to_string(s.selection->width) + "x" + std::to_string(s.selection->height);
    return n;
}

class DefaultChainIdentity : public ::testing::TestWithParam<Shape> {};

TEST_P(DefaultChainIdentity, FusedPathAndThreadsMatchTheReferenceChain) {
    const Shape& s = GetParam();
    const Image input = testImage(s.width, s.height, s.channels, s.depth, 7);
    RunOptions options;
    options.selection = s.selection;
    options.failOnLeak = true;
    const Image reference = run(input, options, true, "1");
    ASSERT_NE(firstDifference(reference, input), "none") << "the default chain changes a noisy image";
    for (const char* threads : {"1", "2", "3", "7"}) {
        const Image fast = run(input, options, false, threads);
        EXPECT_EQ(firstDifference(fast, reference), "none") << threads << " threads";
    }
}

INSTANTIATE_TEST_SUITE_P(
    Shapes, DefaultChainIdentity,
    ::testing::Values(Shape{1, 1, 3, 8, {}}, Shape{2, 7, 3, 8, {}}, Shape{9, 8, 3, 16, {}}, Shape{37, 19, 4, 8, {}},
                      Shape{250, 250, 3, 8, {}}, Shape{251, 263, 3, 16, {}}, Shape{451, 260, 4, 16, {}},
                      Shape{457, 461, 3, 8, {}}, Shape{300, 200, 3, 8, Selection{3, 5, 271, 180}},
                      Shape{520, 470, 3, 16, Selection{1, 7, 453, 301}},
                      Shape{64, 300, 4, 8, Selection{13, 11, 41, 277}},
                      // Column chunks with a remainder, lines shorter than the blur, one row, rows
                      // around the vector mix's block of eight pixels.
                      Shape{216, 31, 3, 8, {}}, Shape{13, 613, 3, 8, {}}, Shape{701, 3, 4, 16, {}},
                      Shape{401, 1, 3, 8, {}}, Shape{8, 9, 3, 8, {}}, Shape{10, 5, 3, 8, {}},
                      Shape{11, 6, 3, 8, {}}, Shape{11, 6, 3, 16, {}}, Shape{333, 517, 4, 16, Selection{5, 9, 317, 499}},
                      Shape{471, 452, 4, 8, Selection{199, 201, 251, 249}}),
    [](const ::testing::TestParamInfo<Shape>& info) { return name(info.param); });

// Settings other than the default must keep taking the chain's blocks: every deterministic mode of
// each step (grain and noise modes draw from rand() and differ run to run), alone or beside step 2's
// default, gives the reference result.
TEST(OtherModes, TakeTheChainAndMatchTheReference) {
    struct Setting {
        int parameter, value;
    };
    std::vector<std::vector<Setting>> settings;
    for (int m : {1, 2, 3, 4, 5, 6, 7, 8, 9, 100, 101, 102, 103, 105, 106, 107, 108}) settings.push_back({{50, m}});
    for (int preset : {1, 2, 3}) settings.push_back({{50, 9}, {49, preset}});
    for (int m : {1, 2, 3, 4}) settings.push_back({{57, m}});     // step 1, step 2 at 104
    for (int m : {1, 2, 3, 4, 6}) settings.push_back({{33, m}});  // step 3
    for (int m : {1, 2, 3, 6}) settings.push_back({{14, m}});     // step 4
    settings.push_back({{50, 0}});                                // every step bypassed
    const Image input = testImage(263, 257, 3, 8, 11);
    for (const auto& setting : settings) {
        std::string text = "vek ";
        for (const Setting& p : setting) text += " Parameter" + std::to_string(p.parameter) + " " + std::to_string(p.value) + " ";
        RunOptions options;
        options.par1 = text;
        options.selection = Selection{1, 2, 259, 251};
        const Image reference = run(input, options, true, "1");
        for (const char* threads : {"1", "3"}) {
            const Image other = run(input, options, false, threads);
            EXPECT_EQ(firstDifference(other, reference), "none") << text << " with " << threads << " threads";
        }
    }
}

}  // namespace
