// PNG and TIFF files: round trips, the 16-bit mapping, and every class of unreadable input.
#include <gtest/gtest.h>
#include <png.h>
#include <tiffio.h>

#include <fstream>

#include "TestSupport.h"
#include "noctiva/host/Error.h"
#include "noctiva/host/ImageFile.h"

using namespace noctiva::host;
namespace fs = std::filesystem;

namespace {

struct RoundTripCase {
    FileFormat format;
    int depth, channels, width, height;
};

class FileRoundTrip : public ::testing::TestWithParam<RoundTripCase> {};

TEST_P(FileRoundTrip, KeepsSizeDepthAlphaAndSamples) {
    const RoundTripCase c = GetParam();
    const fs::path folder = hosttest::scratchFolder("rt");
    const fs::path file = folder / (c.format == FileFormat::Png ? "a.png" : "a.tif");
    const Image image = hosttest::patternImage(c.width, c.height, c.channels, c.depth, 7);
    saveImage(file, image, c.format);
    const LoadedImage loaded = loadImage(file);
    EXPECT_EQ(loaded.format, c.format);
    EXPECT_EQ(loaded.image, image);
    EXPECT_EQ(loaded.original16.size(), c.depth == 16 ? image.sampleCount() : 0u);
    EXPECT_EQ(hosttest::filesIn(folder), 1) << "no temporary file is left behind";
}

INSTANTIATE_TEST_SUITE_P(
    Host, FileRoundTrip,
    ::testing::Values(RoundTripCase{FileFormat::Png, 8, 3, 1, 1}, RoundTripCase{FileFormat::Png, 8, 4, 7, 3},
                      RoundTripCase{FileFormat::Png, 16, 3, 9, 5}, RoundTripCase{FileFormat::Png, 16, 4, 2, 11},
                      RoundTripCase{FileFormat::Tiff, 8, 3, 1, 1}, RoundTripCase{FileFormat::Tiff, 8, 4, 7, 3},
                      RoundTripCase{FileFormat::Tiff, 16, 3, 9, 5}, RoundTripCase{FileFormat::Tiff, 16, 4, 300, 70}));

TEST(Mapping16, MonotoneAndExactForEveryHostValue) {
    for (std::uint32_t v = 1; v <= 65535; ++v) ASSERT_LE(hostFromFile16(std::uint16_t(v - 1)), hostFromFile16(std::uint16_t(v)));
    for (std::uint32_t h = 1; h <= 32768; ++h) ASSERT_LT(fileFromHost16(std::uint16_t(h - 1)), fileFromHost16(std::uint16_t(h)));
    for (std::uint32_t h = 0; h <= 32768; ++h) ASSERT_EQ(hostFromFile16(fileFromHost16(std::uint16_t(h))), h) << h;
    EXPECT_EQ(hostFromFile16(0), 0);
    EXPECT_EQ(hostFromFile16(65535), 32768);
    EXPECT_EQ(fileFromHost16(32768), 65535);
    EXPECT_EQ(fileFromHost16(40000), 65535) << "values above the host maximum saturate";
}

// Every 16-bit file value, once unchanged and once changed by the "filter".
TEST(Mapping16, UnchangedSamplesKeepTheirOriginalFileValue) {
    for (const FileFormat format : {FileFormat::Png, FileFormat::Tiff}) {
        const fs::path folder = hosttest::scratchFolder(format == FileFormat::Png ? "png" : "tif");
        Image file(256, 256, 3, 16);  // 196608 samples: every value three times
        for (std::size_t i = 0; i < file.samples16.size(); ++i) file.samples16[i] = std::uint16_t(i);
        // The source carries every value as its original, so the file gets them verbatim.
        LoadedImage source;
        source.image = file;
        source.original16 = file.samples16;
        for (auto& s : source.image.samples16) s = hostFromFile16(s);
        const fs::path in = folder / (format == FileFormat::Png ? "in.png" : "in.tif");
        saveImage(in, source.image, format, &source);
        LoadedImage loaded = loadImage(in);
        ASSERT_EQ(loaded.original16, file.samples16) << "the file holds every 16-bit value as written";

        Image processed = loaded.image;
        for (std::size_t i = 0; i < processed.samples16.size(); i += 3)
            processed.samples16[i] = std::uint16_t(32768 - processed.samples16[i]);  // red changes, green and blue stay
        const fs::path out = folder / (format == FileFormat::Png ? "out.png" : "out.tif");
        saveImage(out, processed, format, &loaded);
        const LoadedImage result = loadImage(out);
        for (std::size_t i = 0; i < file.samples16.size(); ++i) {
            // A change that lands on the loaded value is no change.
            const bool changed = processed.samples16[i] != loaded.image.samples16[i];
            const std::uint16_t expected = changed ? fileFromHost16(processed.samples16[i]) : file.samples16[i];
            ASSERT_EQ(result.original16[i], expected) << "sample " << i;
        }
    }
}

// Writers for inputs our own writer never produces.
void writeSimplePng(const fs::path& path, png_uint_32 format, int width = 3, int height = 2) {
    png_image image{};
    image.version = PNG_IMAGE_VERSION;
    image.width = png_uint_32(width);
    image.height = png_uint_32(height);
    image.format = format;
    if (format & PNG_FORMAT_FLAG_COLORMAP) image.colormap_entries = 256;
    std::vector<png_byte> pixels(PNG_IMAGE_SIZE(image), 100);
    std::vector<png_byte> colormap(256 * 3, 50);
    ASSERT_TRUE(png_image_write_to_file(&image, path.c_str(), 0, pixels.data(), 0,
                                        format & PNG_FORMAT_FLAG_COLORMAP ? colormap.data() : nullptr));
}

void writeTiff(const fs::path& path, uint16_t photometric, uint16_t spp, uint16_t bits, uint32_t width,
               uint32_t height) {
    TIFF* t = TIFFOpen(path.c_str(), "w");
    ASSERT_NE(t, nullptr);
    TIFFSetField(t, TIFFTAG_IMAGEWIDTH, width);
    TIFFSetField(t, TIFFTAG_IMAGELENGTH, height);
    TIFFSetField(t, TIFFTAG_SAMPLESPERPIXEL, spp);
    TIFFSetField(t, TIFFTAG_BITSPERSAMPLE, bits);
    TIFFSetField(t, TIFFTAG_PHOTOMETRIC, photometric);
    TIFFSetField(t, TIFFTAG_PLANARCONFIG, uint16_t(PLANARCONFIG_CONTIG));
    if (photometric == PHOTOMETRIC_SEPARATED) TIFFSetField(t, TIFFTAG_INKSET, uint16_t(INKSET_CMYK));
    if (photometric == PHOTOMETRIC_PALETTE) {
        std::vector<uint16_t> map(std::size_t(1) << bits, 0);
        TIFFSetField(t, TIFFTAG_COLORMAP, map.data(), map.data(), map.data());
    }
    std::vector<unsigned char> row(std::size_t(width) * spp * bits / 8, 7);
    for (uint32_t y = 0; y < height; ++y) TIFFWriteScanline(t, row.data(), y, 0);
    TIFFClose(t);
}

void expectLoadError(const fs::path& path, const std::string& reasonPart) {
    try {
        loadImage(path);
        FAIL() << path << " loaded";
    } catch (const HostError& e) {
        EXPECT_EQ(e.subject(), path.string());
        EXPECT_NE(e.reason().find(reasonPart), std::string::npos) << e.what();
        EXPECT_EQ(std::string(e.what()).find('\n'), std::string::npos) << "one line";
    }
}

TEST(ImageFileErrors, UnsupportedAndBrokenInputsNameFileAndReason) {
    const fs::path folder = hosttest::scratchFolder("bad");
    writeSimplePng(folder / "gray.png", PNG_FORMAT_GRAY);
    writeSimplePng(folder / "grayalpha.png", PNG_FORMAT_GA);
    writeSimplePng(folder / "palette.png", PNG_FORMAT_RGB_COLORMAP);
    writeTiff(folder / "gray.tif", PHOTOMETRIC_MINISBLACK, 1, 8, 3, 2);
    writeTiff(folder / "cmyk.tif", PHOTOMETRIC_SEPARATED, 4, 8, 3, 2);
    writeTiff(folder / "palette.tif", PHOTOMETRIC_PALETTE, 1, 8, 3, 2);
    writeTiff(folder / "wide.tif", PHOTOMETRIC_RGB, 3, 8, 40000, 1);
    writeTiff(folder / "rgb2.tif", PHOTOMETRIC_RGB, 2, 8, 3, 2);

    const Image good = hosttest::patternImage(40, 30, 3, 8);
    saveImage(folder / "good.png", good, FileFormat::Png);
    saveImage(folder / "good.tif", good, FileFormat::Tiff);
    auto truncate = [&](const char* from, const char* to) {
        std::ifstream in(folder / from, std::ios::binary);
        std::string bytes((std::istreambuf_iterator<char>(in)), {});
        std::ofstream(folder / to, std::ios::binary) << bytes.substr(0, bytes.size() / 2);
    };
    truncate("good.png", "truncated.png");
    truncate("good.tif", "truncated.tif");
    std::ofstream(folder / "text.png") << "hello, not an image";
    std::ofstream(folder / "empty.png");
    fs::create_directory(folder / "folder.png");

    expectLoadError(folder / "gray.png", "gray");
    expectLoadError(folder / "grayalpha.png", "gray with alpha");
    expectLoadError(folder / "palette.png", "palette");
    expectLoadError(folder / "gray.tif", "gray");
    expectLoadError(folder / "cmyk.tif", "CMYK");
    expectLoadError(folder / "palette.tif", "palette");
    expectLoadError(folder / "wide.tif", "larger than 32767");
    expectLoadError(folder / "rgb2.tif", "samples per pixel");
    expectLoadError(folder / "truncated.png", "broken PNG");
    expectLoadError(folder / "truncated.tif", "broken TIFF");
    expectLoadError(folder / "text.png", "not a PNG or TIFF");
    expectLoadError(folder / "empty.png", "empty");
    expectLoadError(folder / "folder.png", "directory");
    expectLoadError(folder / "missing.png", "No such file");
}

TEST(ImageFileErrors, FailedWritesLeaveNoFile) {
    const fs::path folder = hosttest::scratchFolder("write");
    const Image image = hosttest::patternImage(4, 4, 3, 8);
    EXPECT_THROW(saveImage(folder / "no" / "such" / "folder.png", image, FileFormat::Png), HostError);
    Image broken = image;
    broken.samples8.resize(5);
    EXPECT_THROW(saveImage(folder / "broken.png", broken, FileFormat::Png), HostError);
    Image gray(4, 4, 1, 8);
    EXPECT_THROW(saveImage(folder / "gray.tif", gray, FileFormat::Tiff), HostError);
    EXPECT_EQ(hosttest::filesIn(folder), 0);
}

TEST(ImageFile, ExtensionsChooseTheFormat) {
    FileFormat f{};
    EXPECT_TRUE(formatFromExtension("a.PNG", f));
    EXPECT_EQ(f, FileFormat::Png);
    EXPECT_TRUE(formatFromExtension("dir.x/a.tiff", f));
    EXPECT_EQ(f, FileFormat::Tiff);
    EXPECT_TRUE(formatFromExtension("a.Tif", f));
    EXPECT_FALSE(formatFromExtension("a.jpg", f));
    EXPECT_FALSE(formatFromExtension("a", f));
}

}  // namespace
