// The settings text as the module reads it from 'par1' and writes it back at Finish.
#include <gtest/gtest.h>

#include <string>
#include <string_view>

#include "host/TestSupport.h"
#include "noctiva/host/Session.h"
#include "support/NoctivaModule.h"

using namespace noctiva::host;

namespace {

// The text of all 58 entries after a signature, the defaults overridden by number.
std::string entries(int number = -1, const std::string& value = "") {
    std::string text;
    for (const auto& p : shadowParameterTable()) {
        text += " Parameter" + std::to_string(p.number) + " " +
                (int(p.number) == number ? value : std::to_string(p.defaultValue)) + " ";
    }
    return text;
}

RunResult run(std::optional<std::string> par1, Image& image) {
    RunOptions options;
    options.par1 = std::move(par1);
    options.failOnLeak = true;
    return runFilter(testsupport::noctivaModule().entry(), image, options);
}

TEST(SettingsText, WhatIsReadBackDecidesTheRun) {
    const Image input = hosttest::patternImage(64, 48, 3, 8, 5);
    Image byDefault = input;
    const RunResult plain = run(std::nullopt, byDefault);
    ASSERT_TRUE(plain.ok()) << plain.message();
    EXPECT_EQ(plain.par1Out, "vek " + entries()) << "the defaults, with the signature, exactly";

    struct Case {
        const char* what;
        std::string text;
        bool likeDefaults;  // false: step 2 bypassed (mode 0)
    };
    const Case cases[] = {
        {"the signature alone changes nothing", "vek ", true},
        {"no signature: ignored", entries(50, "0").substr(1), true},
        {"what a run without an action writes: ignored", "empty", true},
        {"shorter than a signature: ignored", "ve", true},
        {"the signature's bytes reversed are accepted", " kev" + entries(50, "0"), false},
        {"a value with leading blanks", "vek " + entries(50, "    0"), false},
        {"the text written back reads back", "vek " + entries(50, "0"), false},
    };
    Image bypassed = input;
    ASSERT_TRUE(run("vek " + entries(50, "0"), bypassed).ok());
    ASSERT_NE(bypassed, byDefault);
    for (const auto& c : cases) {
        Image image = input;
        const RunResult r = run(c.text, image);
        ASSERT_TRUE(r.ok()) << c.what << ": " << r.message();
        EXPECT_EQ(image, c.likeDefaults ? byDefault : bypassed) << c.what;
        EXPECT_EQ(r.par1Out, "vek " + entries(50, c.likeDefaults ? "104" : "0")) << c.what;
    }
}

TEST(SettingsText, EveryEntryRoundTripsIncludingNegativeValues) {
    // Bypass every step so the run stays fast; other values are written and read back exactly.
    const std::string text = testsupport::settingsText([](int number, std::int32_t) {
        const bool mode = std::string_view(shadowParameterTable()[std::size_t(number)].name).ends_with(".mode");
        return mode ? 0 : (number % 2 ? -3 - number : 1000 + number);
    });
    Image image = hosttest::patternImage(20, 10, 3, 16, 9);
    const RunResult first = run(text, image);
    ASSERT_TRUE(first.ok()) << first.message();
    EXPECT_EQ(first.par1Out, text);
    const RunResult second = run(first.par1Out, image);
    EXPECT_EQ(second.par1Out, text) << "the text written at Finish, fed to the next run, reproduces it";
}

}  // namespace
