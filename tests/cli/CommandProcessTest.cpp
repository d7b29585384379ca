// The built noctiva command as a user runs it, on small generated files.
#include <gtest/gtest.h>
#include <png.h>
#include <zlib.h>

#include <algorithm>
#include <array>
#include <cstdlib>

#include "CommandSupport.h"
#include "Options.h"
#include "Presets.h"
#include "Settings.h"
#include "host/TestSupport.h"
#include "noctiva/host/ImageFile.h"

using namespace noctiva::host;
using clitest::q;
using clitest::run;
namespace fs = std::filesystem;

namespace {

// The real module where it was built; the error and batch cases also hold with the fake one.
std::string moduleArgument() {
#ifdef NOCTIVA_MODULE_PATH
    return " --module " + q(NOCTIVA_MODULE_PATH);
#else
    return " --module " + q(FAKE_MODULE_PATH);
#endif
}

#ifdef NOCTIVA_MODULE_PATH
#define REQUIRE_REAL_MODULE()
#else
#define REQUIRE_REAL_MODULE() GTEST_SKIP() << "the module was not built"
#endif

std::size_t lines(const std::string& text) { return std::size_t(std::count(text.begin(), text.end(), '\n')); }

// Samples as they are in the file: the 16-bit originals, or the 8-bit values.
std::vector<std::uint16_t> fileSamples(const LoadedImage& l) {
    return l.image.depth == 16 ? l.original16 : l.image.widened();
}

struct RoundTrip {
    const char* input;
    const char* output;
    int channels, depth;
};

class CommandRoundTrip : public ::testing::TestWithParam<RoundTrip> {};

TEST_P(CommandRoundTrip, KeepsSizeDepthAndAlphaAndChangesTheColours) {
    REQUIRE_REAL_MODULE();
    const RoundTrip& c = GetParam();
    const fs::path folder = hosttest::scratchFolder(std::string(c.input) + "-" + c.output);
    const fs::path in = folder / c.input, out = folder / c.output;
    FileFormat inFormat{}, outFormat{};
    ASSERT_TRUE(formatFromExtension(in, inFormat));
    if (!formatFromExtension(out, outFormat)) outFormat = inFormat;  // no extension: the input's format
    saveImage(in, hosttest::patternImage(41, 23, c.channels, c.depth, 7), inFormat);

    const clitest::Outcome o = run(q(in) + " -o " + q(out) + moduleArgument());
    ASSERT_EQ(o.status, 0) << o.err;
    EXPECT_EQ(o.err, "") << "no terminal, no progress bar";
    EXPECT_EQ(lines(o.out), 1u) << o.out;
    const LoadedImage before = loadImage(in), after = loadImage(out);
    EXPECT_EQ(after.format, outFormat);
    ASSERT_EQ(after.image.width, 41);
    ASSERT_EQ(after.image.height, 23);
    ASSERT_EQ(after.image.depth, c.depth);
    ASSERT_EQ(after.image.channels, c.channels);
    long changed = 0;
    const std::vector<std::uint16_t> was = fileSamples(before), is = fileSamples(after);
    for (std::size_t i = 0; i < was.size(); ++i) {
        if (c.channels == 4 && i % 4 == 3)
            ASSERT_EQ(is[i], was[i]) << "alpha passes through, sample " << i;
        else
            changed += is[i] != was[i];
    }
    EXPECT_GT(changed, 0) << "the default settings smooth a noisy image";
}

INSTANTIATE_TEST_SUITE_P(Formats, CommandRoundTrip,
                         ::testing::Values(RoundTrip{"rgb8.png", "out.png", 3, 8}, RoundTrip{"rgba16.png", "out.png", 4, 16},
                                           RoundTrip{"rgba8.tif", "out.tif", 4, 8},
                                           RoundTrip{"rgb16.tiff", "out.tiff", 3, 16},
                                           RoundTrip{"rgba16.png", "converted.tif", 4, 16},
                                           RoundTrip{"rgba16.tif", "noextension", 4, 16}),
                         [](const auto& info) {
                             std::string name = std::string(info.param.input) + "_" + info.param.output;
                             std::replace(name.begin(), name.end(), '.', '_');
                             return name;
                         });

TEST(Command, SelectionLeavesEveryPixelOutsideByteIdentical) {
    REQUIRE_REAL_MODULE();
    const fs::path folder = hosttest::scratchFolder("sel");
    saveImage(folder / "in.png", hosttest::patternImage(61, 50, 3, 16, 3), FileFormat::Png);
    const clitest::Outcome o =
        run(q(folder / "in.png") + " -o " + q(folder / "out.png") + " --selection 7,9,30,21 -q" + moduleArgument());
    ASSERT_EQ(o.status, 0) << o.err;
    EXPECT_EQ(o.out + o.err, "") << "--quiet prints nothing on success";
    const LoadedImage before = loadImage(folder / "in.png"), after = loadImage(folder / "out.png");
    long changedInside = 0;
    for (int y = 0; y < 50; ++y)
        for (int x = 0; x < 61; ++x)
            for (int p = 0; p < 3; ++p) {
                const std::size_t i = before.image.index(x, y, p);
                const bool inside = x >= 7 && x < 37 && y >= 9 && y < 30;
                if (!inside)
                    ASSERT_EQ(fileSamples(after)[i], fileSamples(before)[i]) << x << "," << y;
                else
                    changedInside += fileSamples(after)[i] != fileSamples(before)[i];
            }
    EXPECT_GT(changedInside, 0);
}

TEST(Command, SettingsFromPresetAndSetReachTheModuleExactly) {
    REQUIRE_REAL_MODULE();
    const fs::path folder = hosttest::scratchFolder("set");
    saveImage(folder / "in.tif", hosttest::patternImage(30, 20, 3, 8), FileFormat::Tiff);
    const clitest::Outcome o = run(q(folder / "in.tif") + " -o " + q(folder / "out.tif") +
                             " --preset wavelet --set step2.preset9=2 --set Parameter57=4 --set step2.preset9=3" +
                             " --save-par1 " + q(folder / "par1.txt") + moduleArgument());
    ASSERT_EQ(o.status, 0) << o.err;
    noctiva::cli::ParameterValues expected = noctiva::cli::defaultParameterValues();
    expected[50] = 102;
    expected[49] = 3;
    expected[57] = 4;
    EXPECT_EQ(clitest::readFile(folder / "par1.txt"), noctiva::cli::writeSettingsText(expected))
        << "the module read every entry we built and wrote them back";

}

TEST(Command, BatchGoesOnPastABrokenFileAndFailsAtTheEnd) {
    const fs::path folder = hosttest::scratchFolder("batch");
    fs::create_directories(folder / "out");
    saveImage(folder / "a.png", hosttest::patternImage(20, 12, 3, 8, 1), FileFormat::Png);
    std::ofstream(folder / "broken.png") << "\x89PNG but not really";
    saveImage(folder / "c.tif", hosttest::patternImage(9, 14, 4, 16, 2), FileFormat::Tiff);
    clitest::Outcome o = run(q(folder / "a.png") + " " + q(folder / "broken.png") + " " + q(folder / "c.tif") +
                             " -o " + q(folder / "out") + moduleArgument());
    EXPECT_EQ(o.status, 1);
    EXPECT_EQ(lines(o.err), 1u) << o.err;
    EXPECT_NE(o.err.find("broken.png: "), std::string::npos) << o.err;
    EXPECT_NE(o.out.find("2 of 3 files processed, 1 failed"), std::string::npos) << o.out;
    EXPECT_EQ(loadImage(folder / "out" / "a.png").image.width, 20);
    EXPECT_EQ(loadImage(folder / "out" / "c.tif").image.channels, 4);
    EXPECT_EQ(hosttest::filesIn(folder / "out"), 2);

    // Quiet: not even the summary.
    fs::remove_all(folder / "out");
    fs::create_directories(folder / "out");
    o = run(q(folder / "a.png") + " " + q(folder / "c.tif") + " -o " + q(folder / "out") + " -q" + moduleArgument());
    EXPECT_EQ(o.status, 0) << o.err;
    EXPECT_EQ(o.out, "");
}

TEST(Command, InPlaceOverwritesOnlyWhenAsked) {
    REQUIRE_REAL_MODULE();
    const fs::path folder = hosttest::scratchFolder("inplace");
    const Image original = hosttest::patternImage(25, 25, 3, 8);
    saveImage(folder / "in.png", original, FileFormat::Png);
    clitest::Outcome o = run(q(folder / "in.png") + " -o " + q(folder / "." / "in.png") + moduleArgument());
    EXPECT_EQ(o.status, 1);
    EXPECT_NE(o.err.find("this is the input; use --in-place"), std::string::npos) << o.err;
    EXPECT_EQ(loadImage(folder / "in.png").image, original);
    o = run(q(folder / "in.png") + " --in-place -q" + moduleArgument());
    ASSERT_EQ(o.status, 0) << o.err;
    EXPECT_NE(loadImage(folder / "in.png").image, original);
    EXPECT_EQ(hosttest::filesIn(folder), 1) << "no temporary file left";
}

TEST(Command, ComparePictureShowsBeforeAndAfter) {
    REQUIRE_REAL_MODULE();
    const fs::path folder = hosttest::scratchFolder("compare");
    saveImage(folder / "in.tif", hosttest::patternImage(64, 48, 4, 16), FileFormat::Tiff);
    clitest::Outcome o = run(q(folder / "in.tif") + " -o " + q(folder / "out.tif") + " --compare " +
                             q(folder / "side.png") + " --compare-crop 8,8,40,30" + moduleArgument());
    ASSERT_EQ(o.status, 0) << o.err;
    LoadedImage picture = loadImage(folder / "side.png");
    EXPECT_EQ(picture.format, FileFormat::Png);
    EXPECT_EQ(picture.image.depth, 8);
    EXPECT_EQ(picture.image.channels, 3);
    EXPECT_EQ(picture.image.width, 2 * 40 + 2);
    EXPECT_EQ(picture.image.height, 30);

    o = run(q(folder / "in.tif") + " -o " + q(folder / "out2.tif") + " --compare " + q(folder / "split.png") +
            " --compare-layout split" + moduleArgument());
    ASSERT_EQ(o.status, 0) << o.err;
    picture = loadImage(folder / "split.png");
    EXPECT_EQ(picture.image.width, 64);
    EXPECT_EQ(picture.image.height, 48);
}

// A PNG with a colour type or size the host refuses, written with libpng (or by hand for a size
// libpng will not write).
void writeGrayPng(const fs::path& path) {
    FILE* f = std::fopen(path.c_str(), "wb");
    png_structp png = png_create_write_struct(PNG_LIBPNG_VER_STRING, nullptr, nullptr, nullptr);
    png_infop info = png_create_info_struct(png);
    png_init_io(png, f);
    png_set_IHDR(png, info, 4, 3, 8, PNG_COLOR_TYPE_GRAY, PNG_INTERLACE_NONE, PNG_COMPRESSION_TYPE_DEFAULT,
                 PNG_FILTER_TYPE_DEFAULT);
    png_write_info(png, info);
    std::array<png_byte, 4> row{1, 2, 3, 4};
    for (int y = 0; y < 3; ++y) png_write_row(png, row.data());
    png_write_end(png, nullptr);
    png_destroy_write_struct(&png, &info);
    std::fclose(f);
}

void writePngHeaderOnly(const fs::path& path, std::uint32_t width, std::uint32_t height) {
    std::string bytes = "\x89PNG\r\n\x1a\n";
    const auto be32 = [](std::uint32_t v) {
        return std::string{char(v >> 24), char(v >> 16), char(v >> 8), char(v)};
    };
    std::string ihdr = "IHDR" + be32(width) + be32(height) + std::string{8, 2, 0, 0, 0};
    bytes += be32(13) + ihdr +
             be32(std::uint32_t(crc32(0, reinterpret_cast<const Bytef*>(ihdr.data()), uInt(ihdr.size()))));
    std::ofstream(path, std::ios::binary) << bytes;
}

TEST(Command, EveryErrorIsOneLineWithTheFileAndLeavesNoOutput) {
    const fs::path folder = hosttest::scratchFolder("errors");
    saveImage(folder / "in.png", hosttest::patternImage(6, 6, 3, 8), FileFormat::Png);
    std::ofstream(folder / "junk.png") << "junk";
    writeGrayPng(folder / "gray.png");
    writePngHeaderOnly(folder / "wide.png", 32768, 1);
    writePngHeaderOnly(folder / "tall.png", 1, 40000);
    writePngHeaderOnly(folder / "zero.png", 0, 5);
    fs::create_directories(folder / "adir");
    const int inputs = hosttest::filesIn(folder);

    const std::string in = q(folder / "in.png"), out = " -o " + q(folder / "out.png");
    struct Case {
        std::string arguments;
        std::string expected;  // part of the single stderr line
        std::string module = moduleArgument();
    };
    const std::string fake = " --module " + q(FAKE_MODULE_PATH);
    const Case cases[] = {
        {q(folder / "missing.png") + out, (folder / "missing.png").string() + ": cannot open"},
        {q(folder / "adir") + out, "adir: is a directory"},
        {q(folder / "junk.png") + out, "junk.png: not a PNG or TIFF file"},
        {q(folder / "gray.png") + out, "gray.png: unsupported PNG colour type"},
        {q(folder / "wide.png") + out, "wide.png: "},
        {q(folder / "tall.png") + out, "tall.png: "},
        {q(folder / "zero.png") + out, "zero.png: "},
        {in + out + " --selection 4,4,3,3", "in.png: selection 4,4,3,3 lies outside the 6 x 6 image"},
        {in + out + " --selection -1,0,2,2", "selection -1,0,2,2 lies outside"},
        {in + out + " --selection 0,0,0,2", "has no area"},
        {in + out + " --selection 1,2", "is not X,Y,W,H"},
        // Module failures, told by the fake module, carry the code and its meaning.
        {in + out + " --par1 fail=-108", "-108 (out of memory)", fake},
        {in + out + " --par1 fail=-30101", "-30101 (image mode not supported by the filter)", fake},
        {in + out + " --module /nonexistent.so", "/nonexistent.so: cannot load module", ""},
        {in + out + " --compare " + q(folder / "c.png") + " --compare-crop 5,5,2,2", "compare crop 5,5,2,2 lies outside"},
        {in + out + " --compare " + q(folder / "c.jpg"), "c.jpg: the compare picture is a PNG file"},
        {in + " -o " + q(folder / "nodir" / "out.png"), "nodir/out.png: cannot create file"},
        {in + " -o " + q(folder / "out.jpg"), "out.jpg: unsupported output format"},
        {in + out + " --set step9.mode=1", "unknown parameter \"step9.mode\""},
        {in + out + " --set step2.mode=fast", "\"fast\" is not an integer"},
        {in + out + " --set step2.mode=4294967296", "outside the 32-bit integer range"},
        {in + out + " --preset wavelet --par1 'vek '", "excludes"},
        {in + out + " --preset nonesuch", "unknown preset \"nonesuch\""},
        {in + out + " --par1-file " + q(folder / "nofile"), "nofile: cannot read file"},
        {in + out + " --save-par1 " + q(folder / "nodir" / "p.txt"), "p.txt: cannot write file"},
    };
    for (const Case& c : cases) {
        const clitest::Outcome o = run(c.arguments + c.module);
        EXPECT_EQ(o.status, 1) << c.arguments;
        EXPECT_EQ(o.err.rfind("noctiva: ", 0), 0u) << o.err;
        EXPECT_NE(o.err.find(c.expected), std::string::npos) << c.arguments << "\n" << o.err;
        EXPECT_EQ(lines(o.err), 1u) << o.err;
        EXPECT_EQ(hosttest::filesIn(folder), inputs) << "no output, no leftovers: " << c.arguments;
    }
    // Modules that are no filters.
    std::ofstream(folder / "text.so") << "not a library";
    for (const fs::path& module : {folder / "text.so", folder / "in.png", folder / "none.so"}) {
        const clitest::Outcome o = run(in + out + " --module " + q(module));
        EXPECT_EQ(o.status, 1) << module;
        EXPECT_EQ(o.err.rfind("noctiva: " + module.string() + ": ", 0), 0u) << o.err;
        EXPECT_EQ(lines(o.err), 1u) << o.err;
        EXPECT_FALSE(fs::exists(folder / "out.png"));
    }
}

TEST(Command, HelpDescribesEveryOptionOnItsLine) {
    const clitest::Outcome o = run("--help");
    ASSERT_EQ(o.status, 0) << o.err;
    CLI::App app;
    noctiva::cli::CommandOptions options;
    noctiva::cli::defineOptions(app, options);
    std::size_t checked = 0;
    for (const CLI::Option* option : app.get_options()) {
        const std::string name = option->get_name(false, true);  // "-o,--output", "--set", "inputs"
        if (name == "-h,--help") continue;
        const std::size_t at = o.out.find("\n  " + name + " ");
        ASSERT_NE(at, std::string::npos) << name << "\n" << o.out;
        const std::string line = o.out.substr(at + 1, o.out.find('\n', at + 1) - at - 1);
        EXPECT_NE(line.find(option->get_description()), std::string::npos) << name << ": " << line;
        ++checked;
    }
    EXPECT_GE(checked, 19u);
    EXPECT_NE(o.out.find("info"), std::string::npos);
}

TEST(Command, ReadmeParameterTableIsTheCommandsListing) {
    const clitest::Outcome o = run("--list-parameters");
    ASSERT_EQ(o.status, 0) << o.err;
    EXPECT_EQ(lines(o.out), kShadowParameterCount + 2);
    const std::string readme = clitest::readFile(NOCTIVA_README_PATH);
    const std::string begin = "<!-- parameters: noctiva --list-parameters -->\n", end = "<!-- end of parameters -->";
    const std::size_t from = readme.find(begin), to = readme.find(end);
    ASSERT_NE(from, std::string::npos);
    ASSERT_NE(to, std::string::npos);
    EXPECT_EQ(readme.substr(from + begin.size(), to - from - begin.size()), o.out)
        << "regenerate the README table with build/host/noctiva --list-parameters";
}

TEST(Command, ListsPresets) {
    const clitest::Outcome o = run("--list-presets");
    ASSERT_EQ(o.status, 0) << o.err;
    for (const noctiva::cli::Preset& p : noctiva::cli::presets()) EXPECT_NE(o.out.find(p.name), std::string::npos);
    EXPECT_NE(o.out.find("step2.mode=102"), std::string::npos);
}

TEST(Command, InfoPrintsWhatTheModuleDeclares) {
    REQUIRE_REAL_MODULE();
    clitest::Outcome o = run("info " + q(NOCTIVA_MODULE_PATH));
    ASSERT_EQ(o.status, 0) << o.err;
    for (const char* expected : {"\"Noctiva...\"", "'8BFM' (filter)", "\"**Hidden**\" (hidden", "4.0", "ENTRYPOINT",
                                 "RGB 8-bit", "RGB 16-bit", "'par1' \"Parameter 1\", type 'TEXT'"})
        EXPECT_NE(o.out.find(expected), std::string::npos) << expected << "\n" << o.out;
    o = run("info " + q(FAKE_MODULE_PATH));
    EXPECT_EQ(o.status, 1);
    EXPECT_NE(o.err.find("no PIPL resource"), std::string::npos) << o.err;
}

}  // namespace
