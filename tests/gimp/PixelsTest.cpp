// The plug-in's pixel path must hand back exactly what the command's file writer would.
#include <gtest/gtest.h>

#include <random>

#include "Pixels.h"
#include "noctiva/host/ImageFile.h"

namespace {

using noctiva::host::Image;
using noctiva::host::Selection;
using namespace noctiva::gimp;

std::vector<std::uint16_t> randomSamples(std::size_t n, std::uint16_t max, unsigned seed) {
    std::mt19937 rng(seed);
    std::uniform_int_distribution<int> d(0, max);
    std::vector<std::uint16_t> v(n);
    for (auto& s : v) s = std::uint16_t(d(rng));
    return v;
}

TEST(GimpPixels, EverySixteenBitValueSurvivesAnUntouchedRoundTrip) {
    std::vector<std::uint16_t> all(65536 * 3);
    for (std::size_t i = 0; i < all.size(); ++i) all[i] = std::uint16_t(i / 3);
    const Image image = hostImageFrom16(all, 256, 256, 3);
    EXPECT_EQ(areaSamples16(image, all, Selection{0, 0, 256, 256}), all);
}

struct AreaCase {
    const char* name;
    int width, height, channels;
    Selection area;
};

class GimpPixelsArea : public ::testing::TestWithParam<AreaCase> {};

// Against the command's writer: the same samples for the area, changed or not.
TEST_P(GimpPixelsArea, SixteenBitAreaMatchesTheFileWriter) {
    const AreaCase& c = GetParam();
    const std::size_t n = std::size_t(c.width) * c.height * c.channels;
    const std::vector<std::uint16_t> original = randomSamples(n, 65535, 7);
    Image filtered = hostImageFrom16(original, c.width, c.height, c.channels);
    const std::vector<std::uint16_t> noise = randomSamples(n, 40000, 8);  // some above 32768: saturate
    for (std::size_t i = 0; i < n; i += 3) filtered.samples16[i] = noise[i];
    const std::vector<std::uint16_t> file = noctiva::host::fileSamples16(filtered, original);

    const std::vector<std::uint16_t> out = areaSamples16(filtered, original, c.area);
    ASSERT_EQ(out.size(), std::size_t(c.area.width) * c.area.height * c.channels);
    std::size_t k = 0;
    for (int y = c.area.y; y < c.area.y + c.area.height; ++y)
        for (int x = c.area.x; x < c.area.x + c.area.width; ++x)
            for (int ch = 0; ch < c.channels; ++ch, ++k)
                ASSERT_EQ(out[k], file[filtered.index(x, y, ch)]) << x << "," << y << " channel " << ch;
}

TEST_P(GimpPixelsArea, EightBitAreaIsTheFilteredSamplesClamped) {
    const AreaCase& c = GetParam();
    const std::size_t n = std::size_t(c.width) * c.height * c.channels;
    const std::vector<std::uint16_t> source = randomSamples(n, 255, 9);
    std::vector<std::uint8_t> bytes(source.begin(), source.end());
    Image filtered = hostImageFrom8(bytes, c.width, c.height, c.channels);
    ASSERT_EQ(filtered.widened(), source);
    filtered.set(c.area.x, c.area.y, 0, 300);  // saturates at 255
    const std::vector<std::uint8_t> out = areaSamples8(filtered, c.area);
    ASSERT_EQ(out.size(), std::size_t(c.area.width) * c.area.height * c.channels);
    EXPECT_EQ(out[0], 255);
    std::size_t k = 0;
    for (int y = c.area.y; y < c.area.y + c.area.height; ++y)
        for (int x = c.area.x; x < c.area.x + c.area.width; ++x)
            for (int ch = 0; ch < c.channels; ++ch, ++k) {
                if (k > 0) {
                    ASSERT_EQ(out[k], filtered.at(x, y, ch)) << x << "," << y;
                }
            }
}

INSTANTIATE_TEST_SUITE_P(Areas, GimpPixelsArea,
                         ::testing::Values(AreaCase{"whole", 9, 7, 3, {0, 0, 9, 7}},
                                           AreaCase{"onePixelAtTheEnd", 9, 7, 4, {8, 6, 1, 1}},
                                           AreaCase{"offsetColumn", 17, 8, 3, {5, 1, 1, 7}},
                                           AreaCase{"offsetBlock", 251, 3, 4, {200, 1, 51, 2}}),
                         [](const auto& info) { return std::string(info.param.name); });

TEST(GimpPixels, RefusesShapesAndAreasThatDoNotFit) {
    const std::vector<std::uint8_t> six(6);
    EXPECT_THROW(hostImageFrom8(six, 2, 2, 3), std::invalid_argument);  // 12 expected
    EXPECT_THROW(hostImageFrom8(six, 1, 3, 2), std::invalid_argument);  // grey + alpha
    const Image image(4, 4, 3, 8);
    for (const Selection s : {Selection{-1, 0, 2, 2}, Selection{3, 0, 2, 1}, Selection{0, 0, 0, 1}, Selection{0, 4, 1, 1}})
        EXPECT_THROW(areaSamples8(image, s), std::invalid_argument) << s.x << "," << s.y << "," << s.width;
    const std::vector<std::uint16_t> wrong(5);
    EXPECT_THROW(areaSamples16(Image(4, 4, 3, 16), wrong, Selection{0, 0, 1, 1}), std::invalid_argument);
}

}  // namespace
