// The compare picture, its label font and the progress bar's text.
#include <gtest/gtest.h>

#include "ComparePicture.h"
#include "Progress.h"
#include "host/TestSupport.h"

using namespace noctiva::cli;
using noctiva::host::Image;
using noctiva::host::Selection;

namespace {

// True when some pixel of the box is pure white (the label's ink) and some pure black (its box).
bool hasLabelInk(const Image& picture, int x0, int y0, int w, int h) {
    bool white = false, black = false;
    for (int y = y0; y < y0 + h; ++y)
        for (int x = x0; x < x0 + w; ++x) {
            const int r = picture.at(x, y, 0), g = picture.at(x, y, 1), b = picture.at(x, y, 2);
            white |= r == 255 && g == 255 && b == 255;
            black |= r == 0 && g == 0 && b == 0;
        }
    return white && black;
}

TEST(ComparePicture, SideBySideHoldsBothImagesAndTheirLabels) {
    for (int depth : {8, 16}) {
        // A flat mid-grey keeps the labels the only black and white in the picture.
        Image before(200, 120, 4, depth), after(200, 120, 4, depth);
        const std::uint16_t grey = depth == 16 ? 16384 : 128, other = depth == 16 ? 8192 : 64;
        for (std::size_t i = 0; i < before.sampleCount(); ++i) {
            before.setSample(i, grey);
            after.setSample(i, other);
        }
        const Image picture = comparePicture(before, after, std::nullopt, CompareLayout::SideBySide);
        const int gap = picture.width - 400;
        ASSERT_GE(gap, 2);
        EXPECT_EQ(picture.height, 120);
        EXPECT_EQ(picture.channels, 3) << "alpha is left out";
        EXPECT_EQ(picture.depth, 8);
        const std::uint16_t grey8 = 128, other8 = 64;  // 16384 and 8192 of 32768 round to these
        EXPECT_EQ(picture.at(199, 119, 0), grey8) << depth;
        EXPECT_EQ(picture.at(200 + gap, 119, 2), other8) << depth;
        EXPECT_EQ(picture.at(200, 60, 1), 255) << "the divider";
        EXPECT_TRUE(hasLabelInk(picture, 0, 0, 60, 30));
        EXPECT_TRUE(hasLabelInk(picture, 200 + gap, 0, 60, 30));
        EXPECT_FALSE(hasLabelInk(picture, 0, 60, 200, 60)) << "nothing drawn below the labels";
    }
}

TEST(ComparePicture, CropAndSplitShowTheSameRegionOfBoth) {
    const Image before = hosttest::patternImage(50, 40, 3, 8, 1);
    const Image after = hosttest::patternImage(50, 40, 3, 8, 2);
    const Selection crop{10, 5, 30, 20};
    const Image side = comparePicture(before, after, crop, CompareLayout::SideBySide);
    ASSERT_EQ(side.height, 20);
    const int offset = side.width - 30;
    // Bottom-right corners lie outside the labels: the exact source samples.
    EXPECT_EQ(side.at(29, 19, 0), before.at(39, 24, 0));
    EXPECT_EQ(side.at(offset + 29, 19, 0), after.at(39, 24, 0));

    const Image split = comparePicture(before, after, crop, CompareLayout::Split);
    ASSERT_EQ(split.width, 30);
    EXPECT_EQ(split.at(0, 19, 1), before.at(10, 24, 1));
    EXPECT_EQ(split.at(14, 19, 1), before.at(24, 24, 1)) << "the last column of the left half";
    EXPECT_EQ(split.at(15, 19, 1), 255) << "the dividing line";
    EXPECT_EQ(split.at(16, 19, 1), after.at(26, 24, 1));
    EXPECT_EQ(split.at(29, 19, 2), after.at(39, 24, 2));

    for (const Selection bad : {Selection{41, 0, 10, 10}, Selection{0, 31, 10, 10}, Selection{-1, 0, 5, 5},
                                Selection{0, 0, 0, 5}})
        EXPECT_THROW(comparePicture(before, after, bad, CompareLayout::Split), std::invalid_argument);
    EXPECT_THROW(comparePicture(before, hosttest::patternImage(50, 41, 3, 8), std::nullopt, CompareLayout::Split),
                 std::invalid_argument);
}

TEST(ComparePicture, LabelsClipAtTheEdgesOfTinyPictures) {
    for (int size : {1, 2, 7}) {
        const Image image = hosttest::patternImage(size, size, 3, 16);
        const Image picture = comparePicture(image, image, std::nullopt, CompareLayout::Split);
        EXPECT_EQ(picture.width, size);
    }
    Image canvas(10, 10, 3, 8);
    std::fill(canvas.samples8.begin(), canvas.samples8.end(), 100);
    drawLabel(canvas, -80, -5, "after", 2);  // wholly outside
    drawLabel(canvas, 8, 8, "before", 3);
    EXPECT_EQ(canvas.at(9, 9, 0), 0) << "the box reaches into the corner";
    EXPECT_EQ(canvas.at(5, 5, 0), 100) << "and no further";
    EXPECT_THROW(drawLabel(canvas, 0, 0, "BEFORE", 1), std::invalid_argument);
    EXPECT_EQ(labelWidth("after", 1), 5 * 6 - 1 + 4);
    EXPECT_EQ(labelHeight(2), 22);
}

TEST(ProgressText, BarFloorsAndClamps) {
    struct Case {
        std::int64_t done, total;
        const char* expected;
    };
    const Case cases[] = {
        {0, 100, "[..........]   0%"},    {1, 3, "[###.......]  33%"},  {2, 3, "[######....]  66%"},
        {99, 100, "[#########.]  99%"},   {100, 100, "[##########] 100%"}, {150, 100, "[##########] 100%"},
        {-5, 100, "[..........]   0%"},   {5, 0, "[..........]   0%"},  {3'000'000'000LL, 3'000'000'001LL, "[#########.]  99%"},
    };
    for (const Case& c : cases) EXPECT_EQ(renderBar(c.done, c.total, 10), c.expected) << c.done << "/" << c.total;
    EXPECT_EQ(summaryLine(2.0, 5.0), "done in 2.00 s, 2.50 megapixels/s");
    EXPECT_EQ(summaryLine(0.0, 5.0), "done in 0.00 s");
}

}  // namespace
