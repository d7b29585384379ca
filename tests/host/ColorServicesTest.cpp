// Colour services: fixed points of the textbook formulas and round trips over a grid of colours.
#include <gtest/gtest.h>

#include <cstdlib>

#include "noctiva/host/ColorServices.h"

using noctiva::host::convertColor;

namespace {

struct Known {
    pi::int16 space;
    pi::int16 rgb[3];
    pi::int16 expected[4];
};

TEST(ColorServices, KnownColours) {
    const Known cases[] = {
        {pi::plugIncolorServicesHSBSpace, {255, 0, 0}, {0, 255, 255, 0}},
        {pi::plugIncolorServicesHSBSpace, {0, 0, 255}, {240, 255, 255, 0}},
        {pi::plugIncolorServicesHSBSpace, {128, 128, 128}, {0, 0, 128, 0}},
        {pi::plugIncolorServicesHSLSpace, {0, 255, 0}, {120, 255, 128, 0}},
        {pi::plugIncolorServicesHSLSpace, {255, 255, 255}, {0, 0, 255, 0}},
        {pi::plugIncolorServicesCMYKSpace, {255, 255, 255}, {0, 0, 0, 0}},
        {pi::plugIncolorServicesCMYKSpace, {0, 0, 0}, {0, 0, 0, 255}},
        {pi::plugIncolorServicesCMYKSpace, {255, 0, 0}, {0, 255, 255, 0}},
        {pi::plugIncolorServicesGraySpace, {255, 255, 255}, {255, 0, 0, 0}},
        {pi::plugIncolorServicesGraySpace, {255, 0, 0}, {76, 0, 0, 0}},
        {pi::plugIncolorServicesLabSpace, {255, 255, 255}, {255, 128, 128, 0}},
        {pi::plugIncolorServicesLabSpace, {0, 0, 0}, {0, 128, 128, 0}},
        {pi::plugIncolorServicesLabSpace, {255, 0, 0}, {136, 208, 195, 0}},  // L* 53.2, a* 80.1, b* 67.2
    };
    for (const Known& c : cases) {
        pi::int16 v[4] = {c.rgb[0], c.rgb[1], c.rgb[2], 0};
        ASSERT_EQ(convertColor(pi::plugIncolorServicesRGBSpace, c.space, v), pi::noErr);
        for (int i = 0; i < 4; ++i)
            EXPECT_EQ(v[i], c.expected[i]) << "space " << c.space << " colour " << c.rgb[0] << "," << c.rgb[1] << ","
                                           << c.rgb[2] << " component " << i;
    }
}

TEST(ColorServices, RoundTripsThroughEverySpaceStayClose) {
    // Worst differences after RGB -> space -> RGB. A hue step of one degree moves a component of a
    // saturated colour by up to 255 / 120, so the hue spaces get 3.
    const std::pair<pi::int16, int> spaces[] = {{pi::plugIncolorServicesRGBSpace, 0},
                                                {pi::plugIncolorServicesHSBSpace, 3},
                                                {pi::plugIncolorServicesHSLSpace, 3},
                                                {pi::plugIncolorServicesCMYKSpace, 1}};
    for (const auto& [space, tolerance] : spaces)
        for (int r = 0; r < 256; r += 15)
            for (int g = 0; g < 256; g += 17)
                for (int b = 0; b < 256; b += 51) {
                    pi::int16 v[4] = {pi::int16(r), pi::int16(g), pi::int16(b), 0};
                    ASSERT_EQ(convertColor(pi::plugIncolorServicesRGBSpace, space, v), pi::noErr);
                    ASSERT_EQ(convertColor(space, pi::plugIncolorServicesRGBSpace, v), pi::noErr);
                    EXPECT_LE(std::abs(v[0] - r), tolerance) << space << ": " << r << "," << g << "," << b;
                    EXPECT_LE(std::abs(v[1] - g), tolerance) << space << ": " << r << "," << g << "," << b;
                    EXPECT_LE(std::abs(v[2] - b), tolerance) << space << ": " << r << "," << g << "," << b;
                }
}

// 8-bit Lab is coarse near black in sRGB, so the RGB round trip is loose there; the Lab values
// themselves must come back within a step.
TEST(ColorServices, LabSurvivesTheTripThroughRgb) {
    for (int r = 0; r < 256; r += 15)
        for (int g = 0; g < 256; g += 17)
            for (int b = 0; b < 256; b += 51) {
                pi::int16 lab[4] = {pi::int16(r), pi::int16(g), pi::int16(b), 0};
                ASSERT_EQ(convertColor(pi::plugIncolorServicesRGBSpace, pi::plugIncolorServicesLabSpace, lab), pi::noErr);
                pi::int16 again[4] = {lab[0], lab[1], lab[2], 0};
                ASSERT_EQ(convertColor(pi::plugIncolorServicesLabSpace, pi::plugIncolorServicesRGBSpace, again), pi::noErr);
                ASSERT_EQ(convertColor(pi::plugIncolorServicesRGBSpace, pi::plugIncolorServicesLabSpace, again), pi::noErr);
                for (int i = 0; i < 3; ++i)
                    EXPECT_LE(std::abs(again[i] - lab[i]), 2) << r << "," << g << "," << b << " component " << i;
            }
}

TEST(ColorServices, GrayGoesToNeutralAndBack) {
    for (int g = 0; g < 256; ++g) {
        pi::int16 v[4] = {pi::int16(g), 0, 0, 0};
        ASSERT_EQ(convertColor(pi::plugIncolorServicesGraySpace, pi::plugIncolorServicesRGBSpace, v), pi::noErr);
        EXPECT_TRUE(v[0] == g && v[1] == g && v[2] == g) << g;
        ASSERT_EQ(convertColor(pi::plugIncolorServicesRGBSpace, pi::plugIncolorServicesGraySpace, v), pi::noErr);
        EXPECT_EQ(v[0], g);
    }
}

TEST(ColorServices, OutOfRangeInputIsClampedAndUnknownSpacesRefused) {
    pi::int16 v[4] = {300, -5, 1000, 0};
    ASSERT_EQ(convertColor(pi::plugIncolorServicesRGBSpace, pi::plugIncolorServicesHSBSpace, v), pi::noErr);
    EXPECT_GE(v[0], 0);
    EXPECT_LT(v[0], 360);
    pi::int16 hue[4] = {-30, 255, 255, 0};  // -30 degrees is 330
    ASSERT_EQ(convertColor(pi::plugIncolorServicesHSBSpace, pi::plugIncolorServicesRGBSpace, hue), pi::noErr);
    EXPECT_EQ(hue[0], 255);
    EXPECT_EQ(hue[1], 0);
    EXPECT_EQ(hue[2], 128);
    pi::int16 w[4] = {1, 2, 3, 4};
    EXPECT_EQ(convertColor(pi::plugIncolorServicesRGBSpace, pi::plugIncolorServicesXYZSpace, w), pi::paramErr);
    EXPECT_EQ(convertColor(pi::plugIncolorServicesChosenSpace, pi::plugIncolorServicesRGBSpace, w), pi::paramErr);
    EXPECT_EQ(w[0], 1) << "a refused conversion leaves the components alone";
}

}  // namespace
