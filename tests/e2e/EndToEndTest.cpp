// The real module through our host on generated PNG and TIFF files.
#include <gtest/gtest.h>
#include <sys/wait.h>

#include <cstdlib>
#include <optional>

#include "host/TestSupport.h"
#include "noctiva/host/ImageFile.h"
#include "noctiva/host/Session.h"
#include "support/NoctivaModule.h"

using namespace noctiva::host;
namespace fs = std::filesystem;

namespace {

using testsupport::noctivaModule;

struct Case {
    const char* name;
    FileFormat format;
    int width, height, channels, depth;
    std::optional<Selection> selection;
    bool relocate = false;
};

std::ostream& operator<<(std::ostream& os, const Case& c) { return os << c.name; }

class EndToEnd : public ::testing::TestWithParam<Case> {};

TEST_P(EndToEnd, RunSucceedsKeepsTheFileShapeAndTouchesOnlyTheSelection) {
    const Case& c = GetParam();
    const fs::path folder = hosttest::scratchFolder(c.name);
    const fs::path in = folder / (c.format == FileFormat::Png ? "in.png" : "in.tif");
    const fs::path out = folder / (c.format == FileFormat::Png ? "out.png" : "out.tif");
    saveImage(in, hosttest::patternImage(c.width, c.height, c.channels, c.depth, 42), c.format);

    const LoadedImage source = loadImage(in);
    Image image = source.image;
    RunOptions options;
    options.selection = c.selection;
    options.relocateHandles = c.relocate;
    options.failOnLeak = true;
    const RunResult result = runFilter(noctivaModule().entry(), image, options);
    ASSERT_TRUE(result.ok()) << result.message();
    EXPECT_FALSE(result.leaks.any()) << result.leaks.describe();
    EXPECT_EQ(result.par1Out.rfind("vek ", 0), 0u) << "the module records its settings: " << result.par1Out;
    ASSERT_FALSE(result.progress.empty());
    EXPECT_EQ(result.progress.back().first, result.progress.back().second) << "progress ends complete";

    // Tiles served by pointing into the image or through copied buffers: the same pixels.
    Image copied = source.image;
    options.copyTiles = true;
    ASSERT_TRUE(runFilter(noctivaModule().entry(), copied, options).ok());
    ASSERT_EQ(copied, image);

    saveImage(out, image, source.format, &source);
    const LoadedImage written = loadImage(out);
    ASSERT_EQ(written.format, source.format);
    ASSERT_EQ(written.image.width, c.width);
    ASSERT_EQ(written.image.height, c.height);
    ASSERT_EQ(written.image.depth, c.depth);
    ASSERT_EQ(written.image.channels, c.channels);

    // Compare what is in the files: outside the selection, and alpha everywhere, byte for byte.
    const auto before = c.depth == 16 ? source.original16 : source.image.widened();
    const auto after = c.depth == 16 ? written.original16 : written.image.widened();
    const Selection s = c.selection.value_or(Selection{0, 0, c.width, c.height});
    long changedInside = 0;
    for (int y = 0; y < c.height; ++y)
        for (int x = 0; x < c.width; ++x) {
            const bool inside = x >= s.x && x < s.x + s.width && y >= s.y && y < s.y + s.height;
            for (int p = 0; p < c.channels; ++p) {
                const std::size_t i = source.image.index(x, y, p);
                if (!inside || p == 3)
                    ASSERT_EQ(after[i], before[i]) << x << "," << y << " plane " << p;
                else if (after[i] != before[i])
                    ++changedInside;
            }
        }
    // Default settings smooth colour noise: a noisy area cannot come through unchanged.
    if (s.width >= 16 && s.height >= 16) {
        EXPECT_GT(changedInside, 0);
    }
}

INSTANTIATE_TEST_SUITE_P(
    Host, EndToEnd,
    ::testing::Values(Case{"png8_1x1", FileFormat::Png, 1, 1, 3, 8, {}},
                      Case{"tif16_rgba_37x23", FileFormat::Tiff, 37, 23, 4, 16, {}},
                      Case{"png8_301x257", FileFormat::Png, 301, 257, 3, 8, {}},
                      Case{"png16_rgba_251x203_relocating", FileFormat::Png, 251, 203, 4, 16, {}, true},
                      Case{"tif8_rgba_64x48_selection", FileFormat::Tiff, 64, 48, 4, 8, Selection{5, 6, 30, 20}},
                      Case{"tif16_263x260_selection", FileFormat::Tiff, 263, 260, 3, 16, Selection{13, 7, 240, 251}},
                      Case{"png8_99x71_edge_selection", FileFormat::Png, 99, 71, 3, 8, Selection{98, 0, 1, 71}, true}),
    [](const auto& info) { return std::string(info.param.name); });

TEST(EndToEndFailures, NoBufferMemoryEndsWithOutOfMemoryAndNoLeak) {
    for (const int depth : {8, 16}) {
        Image image = hosttest::patternImage(40, 30, 3, depth);
        RunOptions options;
        options.bufferCap = 0;
        const RunResult result = runFilter(noctivaModule().entry(), image, options);
        EXPECT_EQ(result.result, pi::memFullErr) << result.message();
        EXPECT_FALSE(result.leaks.any()) << result.leaks.describe();
    }
}

TEST(EndToEndSettings, RecordedSettingsPlayBackUnchanged) {
    Image first = hosttest::patternImage(50, 40, 3, 8);
    const RunResult recorded = runFilter(noctivaModule().entry(), first);
    ASSERT_TRUE(recorded.ok()) << recorded.message();
    Image second = hosttest::patternImage(50, 40, 3, 8);
    RunOptions options;
    options.par1 = recorded.par1Out;
    options.dRes = 0;
    const RunResult played = runFilter(noctivaModule().entry(), second, options);
    ASSERT_TRUE(played.ok()) << played.message();
    EXPECT_EQ(played.par1Out, recorded.par1Out);
    EXPECT_EQ(second, first) << "the same settings give the same result";
}

TEST(EndToEndCommand, DefaultModuleBesideTheCommand) {
    const fs::path folder = hosttest::scratchFolder("cli");
    saveImage(folder / "in.png", hosttest::patternImage(30, 20, 4, 16), FileFormat::Png);
    const std::string command = std::string("'") + NOCTIVA_COMMAND_PATH + "' '" + (folder / "in.png").string() +
                                "' -o '" + (folder / "out.tif").string() + "' --quiet --save-par1 '" +
                                (folder / "par1.txt").string() + "'";
    const int status = std::system(command.c_str());
    ASSERT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0) << command;
    const LoadedImage out = loadImage(folder / "out.tif");
    EXPECT_EQ(out.image.depth, 16);
    EXPECT_EQ(out.image.channels, 4);
    EXPECT_TRUE(fs::exists(folder / "par1.txt"));
}

}  // namespace
