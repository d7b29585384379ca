// The noctiva command, run as a process with the fake module.
#include <gtest/gtest.h>

#include <sys/wait.h>

#include <algorithm>
#include <cstdlib>
#include <fstream>
#include <sstream>

#include "TestSupport.h"
#include "noctiva/host/ImageFile.h"

using namespace noctiva::host;
namespace fs = std::filesystem;

namespace {

struct Outcome {
    int status;
    std::string out, err;
};

std::string readFile(const fs::path& p) {
    std::ifstream in(p, std::ios::binary);
    std::stringstream s;
    s << in.rdbuf();
    return s.str();
}

Outcome runCommand(const fs::path& folder, const std::string& arguments, bool withModule = true) {
    const std::string command = std::string("'") + NOCTIVA_COMMAND_PATH + "' " + arguments +
                                (withModule ? std::string(" --module '") + FAKE_MODULE_PATH + "'" : "") + " >'" +
                                (folder / "stdout").string() + "' 2>'" + (folder / "stderr").string() + "'";
    const int status = std::system(command.c_str());
    Outcome o{WIFEXITED(status) ? WEXITSTATUS(status) : -1, readFile(folder / "stdout"), readFile(folder / "stderr")};
    fs::remove(folder / "stdout");
    fs::remove(folder / "stderr");
    return o;
}

std::string q(const fs::path& p) { return "'" + p.string() + "'"; }

TEST(Command, ProcessesAFileAndKeepsFormatAndDepth) {
    const fs::path folder = hosttest::scratchFolder("ok");
    const Image image = hosttest::patternImage(13, 9, 4, 16);
    saveImage(folder / "in.tif", image, FileFormat::Tiff);
    const Outcome o = runCommand(folder, q(folder / "in.tif") + " -o " + q(folder / "out") +
                                             " --par1 'tile=4 margin=1' --save-par1 " + q(folder / "par1.txt"));
    ASSERT_EQ(o.status, 0) << o.err;
    const LoadedImage out = loadImage(folder / "out");
    EXPECT_EQ(out.format, FileFormat::Tiff) << "no extension: the input's format";
    EXPECT_EQ(out.image.width, 13);
    EXPECT_EQ(out.image.depth, 16);
    EXPECT_EQ(out.image.channels, 4);
    EXPECT_EQ(out.image.at(3, 3, 0), 32768 - image.at(3, 3, 0));
    EXPECT_EQ(out.image.at(3, 3, 3), image.at(3, 3, 3));
    EXPECT_EQ(readFile(folder / "par1.txt"), "tiles=12 moves=0 dres=-1 colors=0 got=tile=4 margin=1");
}

TEST(Command, ExtensionOfTheOutputChoosesTheFormatAndSelectionLimitsTheWork) {
    const fs::path folder = hosttest::scratchFolder("sel");
    const Image image = hosttest::patternImage(10, 10, 3, 8);
    saveImage(folder / "in.png", image, FileFormat::Png);
    const Outcome o = runCommand(folder, q(folder / "in.png") + " -o " + q(folder / "out.tiff") +
                                             " --selection 2,3,4,5 --quiet --dres 3");
    ASSERT_EQ(o.status, 0) << o.err;
    EXPECT_EQ(o.out, "");
    const LoadedImage out = loadImage(folder / "out.tiff");
    EXPECT_EQ(out.format, FileFormat::Tiff);
    for (int y = 0; y < 10; ++y)
        for (int x = 0; x < 10; ++x) {
            const bool selected = x >= 2 && x < 6 && y >= 3 && y < 8;
            EXPECT_EQ(out.image.at(x, y, 1), selected ? 255 - image.at(x, y, 1) : image.at(x, y, 1));
        }
}

TEST(Command, EveryErrorIsOneLineAndLeavesNoOutput) {
    const fs::path folder = hosttest::scratchFolder("err");
    saveImage(folder / "in.png", hosttest::patternImage(6, 6, 3, 8), FileFormat::Png);
    std::ofstream(folder / "junk.png") << "junk";
    struct Case {
        std::string arguments;
        std::string expected;  // part of the single stderr line
        bool withModule = true;
    };
    const std::string in = q(folder / "in.png"), out = q(folder / "out.png");
    const Case cases[] = {
        {q(folder / "missing.png") + " -o " + out, (folder / "missing.png").string() + ": cannot open"},
        {q(folder / "junk.png") + " -o " + out, "junk.png: not a PNG or TIFF file"},
        {in + " -o " + q(folder / "out.jpg"), "out.jpg: unsupported output format"},
        {in + " -o " + out + " --selection 4,4,3,3", "selection 4,4,3,3 lies outside the 6 x 6 image"},
        {in + " -o " + out + " --selection 1,2", "is not X,Y,W,H"},
        {in + " -o " + out + " --par1 fail=-108", "-108 (out of memory)"},
        {in + " -o " + out + " --par1 fail=-30101", "-30101 (image mode not supported by the filter)"},
        {in + " -o " + out + " --par1-file " + q(folder / "nofile"), "nofile: cannot read file"},
        {in + " -o " + out + " --module /nonexistent.so", "/nonexistent.so: cannot load module", false},
        {in + " -o " + q(folder / "nodir" / "out.png"), "cannot create file"},
        {in + " -o " + out + " --save-par1 " + q(folder / "nodir" / "par1.txt"), "par1.txt: cannot write file"},
    };
    for (const Case& c : cases) {
        const Outcome o = runCommand(folder, c.arguments, c.withModule);
        EXPECT_EQ(o.status, 1) << c.arguments;
        EXPECT_EQ(o.err.rfind("noctiva: ", 0), 0u) << o.err;
        EXPECT_NE(o.err.find(c.expected), std::string::npos) << c.arguments << "\n" << o.err;
        EXPECT_EQ(std::count(o.err.begin(), o.err.end(), '\n'), 1) << o.err;
        EXPECT_FALSE(fs::exists(folder / "out.png")) << c.arguments;
        EXPECT_EQ(hosttest::filesIn(folder), 2) << "nothing but the two inputs: " << c.arguments;
    }
}

}  // namespace
