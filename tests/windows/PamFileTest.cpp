// PAM files: what the Windows host reads and writes, so the two hosts exchange images losslessly.
#include <gtest/gtest.h>

#include <fstream>
#include <iterator>
#include <string>

#include "host/TestSupport.h"
#include "noctiva/host/Error.h"
#include "noctiva/host/ImageFile.h"

namespace fs = std::filesystem;
using namespace noctiva::host;

namespace {

std::string fileBytes(const fs::path& path) {
    std::ifstream in(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), {}};
}

void writeBytes(const fs::path& path, const std::string& bytes) {
    std::ofstream(path, std::ios::binary) << bytes;
}

TEST(PamFile, RoundTripsEveryLayoutItWrites) {
    const fs::path folder = hosttest::scratchFolder("pam-rt");
    for (int depth : {8, 16})
        for (int channels : {3, 4}) {
            SCOPED_TRACE(std::to_string(depth) + " bits, " + std::to_string(channels) + " channels");
            const fs::path file = folder / "a.pam";
            const Image image = hosttest::patternImage(37, 5, channels, depth, 11);
            saveImage(file, image, FileFormat::Pam);
            const LoadedImage loaded = loadImage(file);
            EXPECT_EQ(loaded.format, FileFormat::Pam);
            EXPECT_EQ(loaded.image, image);
            EXPECT_EQ(hosttest::filesIn(folder), 1) << "no temporary file is left behind";
        }
}

TEST(PamFile, WritesTheStandardHeaderAndBigEndianSamples) {
    const fs::path folder = hosttest::scratchFolder("pam-bytes");
    Image image(2, 1, 3, 16);
    image.samples16 = {1, 1, 32768, 16384, 100, 200};  // host scale
    LoadedImage source;
    source.image = image;
    source.original16 = {1, 3, 65535, 32768, 200, 400};  // unchanged samples keep these (1, not 2)
    saveImage(folder / "b.pam", image, FileFormat::Pam, &source);
    const std::string expected = std::string("P7\nWIDTH 2\nHEIGHT 1\nDEPTH 3\nMAXVAL 65535\nTUPLTYPE RGB\nENDHDR\n") +
                                 std::string("\x00\x01\x00\x02\xFF\xFF\x80\x00\x00\xC8\x01\x90", 12);
    EXPECT_EQ(fileBytes(folder / "b.pam"), expected);
}

TEST(PamFile, ReadsCommentsAndAnyFieldOrder) {
    const fs::path folder = hosttest::scratchFolder("pam-read");
    writeBytes(folder / "c.pam", "P7\n# made by hand\nTUPLTYPE RGB_ALPHA\nMAXVAL 255\nDEPTH 4 # four\n"
                                 "HEIGHT 1\nWIDTH 1\nENDHDR\n\x01\x02\x03\x04");
    const LoadedImage loaded = loadImage(folder / "c.pam");
    EXPECT_EQ(loaded.image.channels, 4);
    EXPECT_EQ(loaded.image.depth, 8);
    EXPECT_EQ(loaded.image.samples8, (std::vector<std::uint8_t>{1, 2, 3, 4}));
}

TEST(PamFile, RefusesWhatItCannotRepresent) {
    const fs::path folder = hosttest::scratchFolder("pam-bad");
    const struct {
        const char* bytes;
        const char* reason;
    } cases[] = {
        {"P7\nWIDTH 2\nHEIGHT 1\nDEPTH 3\nMAXVAL 255\nENDHDR\n\x01\x02\x03", "truncated"},
        {"P7\nWIDTH 1\nHEIGHT 1\nDEPTH 1\nMAXVAL 255\nTUPLTYPE GRAYSCALE\nENDHDR\n\x01", "RGB"},
        {"P7\nWIDTH 1\nHEIGHT 1\nDEPTH 3\nMAXVAL 1023\nENDHDR\n\x01\x02\x03\x04\x05\x06", "maxval"},
        {"P7\nWIDTH 0\nHEIGHT 1\nDEPTH 3\nMAXVAL 255\nENDHDR\n", "zero size"},
        {"P7\nWIDTH 40000\nHEIGHT 1\nDEPTH 3\nMAXVAL 255\nENDHDR\n", "larger than 32767"},
        {"P7\nWIDTH -1\nHEIGHT 1\nDEPTH 3\nMAXVAL 255\nENDHDR\n", "bad WIDTH"},
        {"P7\nWIDTH 1\nHEIGHT 1\nDEPTH 3\nMAXVAL 255\n", "no ENDHDR"},
        {"P7\nWIDTH 1\nCOLOUR 3\nENDHDR\n", "unknown field"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.bytes);
        writeBytes(folder / "bad.pam", c.bytes);
        try {
            loadImage(folder / "bad.pam");
            ADD_FAILURE() << "loaded";
        } catch (const HostError& e) {
            EXPECT_NE(std::string(e.what()).find(c.reason), std::string::npos) << e.what();
        }
    }
}

TEST(PamFile, IsChosenByItsExtension) {
    FileFormat format = FileFormat::Png;
    EXPECT_TRUE(formatFromExtension("out.PAM", format));
    EXPECT_EQ(format, FileFormat::Pam);
}

}  // namespace
