// The preset or settings text a script or the dialog picks, and what is remembered between runs.
#include <gtest/gtest.h>

#include "Choice.h"
#include "Presets.h"

namespace {

using namespace noctiva::gimp;
namespace host = noctiva::cli;

TEST(GimpChoice, SettingsTextFollowsThePresetOrTheText) {
    const std::string impulse = host::presetSettingsText(*host::findPreset("impulse"));
    struct Case {
        Choice choice;
        std::optional<std::string> expected;
    } cases[] = {
        {{"", ""}, std::nullopt},
        {{"", "vek  Parameter50 1 "}, "vek  Parameter50 1 "},
        {{"impulse", ""}, impulse},
    };
    for (const Case& c : cases)
        EXPECT_EQ(settingsTextFor(c.choice), c.expected) << c.choice.preset << "|" << c.choice.settings;
}

TEST(GimpChoice, RefusesAnUnknownPresetAndAPresetWithAText) {
    try {
        settingsTextFor({"no-such", ""});
        FAIL() << "no error";
    } catch (const std::invalid_argument& e) {
        EXPECT_NE(std::string(e.what()).find("unknown preset \"no-such\""), std::string::npos) << e.what();
        EXPECT_NE(std::string(e.what()).find("grade-grain"), std::string::npos) << "names the known ones";
    }
    EXPECT_THROW(settingsTextFor({"impulse", "vek "}), std::invalid_argument);
}

TEST(GimpChoice, RememberedValuesRoundTrip) {
    const Choice cases[] = {{"", ""}, {"rank", ""}, {"", "vek  Parameter50 3 "}, {"x", std::string("a\0b", 3)}};
    for (const Choice& c : cases) EXPECT_EQ(decodeChoice(encodeChoice(c)), c) << c.preset;
}

TEST(GimpChoice, DamagedRememberedValuesReadAsNone) {
    const std::vector<char> good = encodeChoice({"impulse", "vek  Parameter50 1 "});
    for (std::size_t n = 0; n < good.size(); ++n)
        EXPECT_FALSE(decodeChoice(std::span(good.data(), n))) << "truncated to " << n;
    std::vector<char> longer = good;
    longer.push_back('x');
    EXPECT_FALSE(decodeChoice(longer));
    std::vector<char> otherMagic = good;
    otherMagic[3] = '2';
    EXPECT_FALSE(decodeChoice(otherMagic));
    std::vector<char> hugeLength = good;
    hugeLength[4] = hugeLength[5] = hugeLength[6] = hugeLength[7] = char(0xff);
    EXPECT_FALSE(decodeChoice(hugeLength));
}

}  // namespace
