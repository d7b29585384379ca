// Settings texts, --set, presets and the order they compose in; which file goes where.
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>

#include "Batch.h"
#include "Options.h"
#include "Presets.h"
#include "Settings.h"

using namespace noctiva::cli;
namespace fs = std::filesystem;

namespace {

std::size_t indexOf(const char* name) { return std::size_t(findShadowParameter(name)->number); }

TEST(SettingsText, WritesEveryEntryWithTwoBlanksBetween) {
    ParameterValues values = defaultParameterValues();
    values[0] = -3;
    const std::string text = writeSettingsText(values);
    EXPECT_EQ(text.rfind("vek  Parameter0 -3  Parameter1 0  Parameter2 0 ", 0), 0u) << text;
    EXPECT_TRUE(text.ends_with("  Parameter56 0  Parameter57 0 ")) << text;
    EXPECT_NE(text.find(" Parameter50 104 "), std::string::npos);
    EXPECT_EQ(std::count(text.begin(), text.end(), 'P'), 58);
}

TEST(SettingsText, ReadsBackWhatItWrote) {
    ParameterValues values{};
    for (std::size_t i = 0; i < values.size(); ++i) values[i] = std::int32_t(i * 7919) - 200000;
    values[5] = INT32_MIN;
    values[50] = INT32_MAX;
    ParameterValues read = defaultParameterValues();
    ASSERT_TRUE(readSettingsText(writeSettingsText(values), read));
    EXPECT_EQ(read, values);
}

TEST(SettingsText, ReadsTheWayTheModuleDoes) {
    const ParameterValues defaults = defaultParameterValues();
    struct Case {
        const char* text;
        bool accepted;
        std::vector<std::pair<std::size_t, std::int32_t>> expected;  // differences from the defaults
    };
    const Case cases[] = {
        {"vek ", true, {}},
        {"kev  Parameter0 1 ", false, {}},
        {" kev Parameter0 7 ", true, {{0, 7}}},  // the signature's bytes reversed
        {"vek  Parameter3    -12 ", true, {{3, -12}}},
        {"vek  Parameter0 x ", true, {{0, 0}}},  // no digits reads as 0
        // Substring match: the search for Parameter5 finds "Parameter5" in "Parameter57 9", reads
        // the 7 that follows, and the cursor has passed the real Parameter57 entry.
        {"vek  Parameter57 9 ", true, {{5, 7}}},
        {"Parameter0 1", false, {}},
    };
    for (const Case& c : cases) {
        ParameterValues values = defaults;
        EXPECT_EQ(readSettingsText(c.text, values), c.accepted) << c.text;
        ParameterValues expected = defaults;
        for (auto [i, v] : c.expected) expected[i] = v;
        EXPECT_EQ(values, expected) << c.text;
    }
}

TEST(Assignment, AcceptsNamesAndIntegersAndRefusesTheRest) {
    struct Case {
        const char* text;
        bool ok;
        const char* parameter;
        std::int32_t value;
        const char* reason;  // part of the message when refused
    };
    const Case cases[] = {
        {"step2.mode=102", true, "step2.mode", 102, ""},
        {"Parameter57=4", true, "step1.mode", 4, ""},
        {"step4.toneSelector4=-1", true, "step4.toneSelector4", -1, ""},
        {"step2.impulseLevel=+9", true, "step2.impulseLevel", 9, ""},
        {"step2.mode=2147483647", true, "step2.mode", INT32_MAX, ""},
        {"step2.mode=-2147483648", true, "step2.mode", INT32_MIN, ""},
        {"step2.mode=2147483648", false, "", 0, "outside the 32-bit integer range"},
        {"step2.mode=-2147483649", false, "", 0, "outside the 32-bit integer range"},
        {"step2.mode=99999999999999999999", false, "", 0, "outside the 32-bit integer range"},
        {"step2.mode=1.5", false, "", 0, "is not an integer"},
        {"step2.mode=", false, "", 0, "is not an integer"},
        {"step2.mode=+-3", false, "", 0, "is not an integer"},
        {"step2.mode= 3", false, "", 0, "is not an integer"},
        {"step2.mode=0x10", false, "", 0, "is not an integer"},
        {"step9.mode=1", false, "", 0, "unknown parameter \"step9.mode\""},
        {"Parameter58=1", false, "", 0, "unknown parameter"},
        {"Parameter5x=1", false, "", 0, "unknown parameter"},
        {"step2.mode", false, "", 0, "is not NAME=VALUE"},
    };
    for (const Case& c : cases) {
        if (c.ok) {
            const Assignment a = parseAssignment(c.text);
            EXPECT_EQ(a.number, indexOf(c.parameter)) << c.text;
            EXPECT_EQ(a.value, c.value) << c.text;
        } else {
            try {
                parseAssignment(c.text);
                ADD_FAILURE() << c.text << " was accepted";
            } catch (const std::invalid_argument& e) {
                EXPECT_NE(std::string(e.what()).find(c.reason), std::string::npos) << e.what();
            }
        }
    }
}

// `f` must throw a UsageError whose message holds `reason`.
template <class F>
void expectUsageError(F&& f, const std::string& reason) {
    try {
        f();
        ADD_FAILURE() << "accepted, expected: " << reason;
    } catch (const UsageError& e) {
        EXPECT_NE(std::string(e.what()).find(reason), std::string::npos) << e.what();
    }
}

ParameterValues valuesOf(const std::optional<std::string>& text) {
    ParameterValues values{};
    values.fill(-777);  // so an entry missing from the text shows
    EXPECT_TRUE(text.has_value());
    if (text) {
        EXPECT_TRUE(readSettingsText(*text, values));
    }
    return values;
}

TEST(Composition, PresetOrTextIsTheBaseAndEverySetFollowsInOrder) {
    CommandOptions o;
    EXPECT_FALSE(settingsFromOptions(o).has_value()) << "nothing asked: the module keeps its defaults";

    o.par1 = "anything at all";
    EXPECT_EQ(settingsFromOptions(o), "anything at all") << "a text without --set passes untouched";

    o = {};
    o.sets = {"step2.mode=1", "step1.mode=2", "step2.mode=3"};
    ParameterValues expected = defaultParameterValues();
    expected[indexOf("step2.mode")] = 3;  // the later --set wins
    expected[indexOf("step1.mode")] = 2;
    EXPECT_EQ(valuesOf(settingsFromOptions(o)), expected);
    EXPECT_EQ(*settingsFromOptions(o), writeSettingsText(expected));

    o = {};
    o.preset = "grade-grain";
    o.sets = {"step4.toneRed5=80"};
    expected = defaultParameterValues();
    for (const PresetChange& c : findPreset("grade-grain")->changes) expected[indexOf(c.parameter)] = c.value;
    expected[indexOf("step4.toneRed5")] = 80;
    EXPECT_EQ(valuesOf(settingsFromOptions(o)), expected);

    o = {};
    ParameterValues given = defaultParameterValues();
    given[indexOf("step2.mode")] = 105;
    given[indexOf("step1.mode")] = 4;
    o.par1 = writeSettingsText(given);
    o.sets = {"step1.edgeStrength=60"};
    expected = given;
    expected[indexOf("step1.edgeStrength")] = 60;
    EXPECT_EQ(valuesOf(settingsFromOptions(o)), expected);

    // A partial text is read over the defaults, as the module would read it.
    o.par1 = "vek  Parameter57 9 ";
    expected = defaultParameterValues();
    expected[5] = 7;  // "Parameter5" matched inside "Parameter57"; step1.mode keeps its default
    expected[indexOf("step1.edgeStrength")] = 60;
    EXPECT_EQ(valuesOf(settingsFromOptions(o)), expected);
}

TEST(Composition, RefusesWhatCannotBeCombined) {
    const auto refused = [](const CommandOptions& o, const std::string& reason) {
        expectUsageError([&] { settingsFromOptions(o); }, reason);
    };
    CommandOptions o;
    o.preset = "default";
    o.par1 = "vek ";
    refused(o, "--preset cannot be combined");
    o = {};
    o.preset = "nonesuch";
    refused(o, "unknown preset \"nonesuch\"");
    o = {};
    o.par1 = "no signature";
    o.sets = {"step2.mode=1"};
    refused(o, "starting with \"vek \"");
    o = {};
    o.sets = {"step2.mode=1", "bogus=1"};
    refused(o, "unknown parameter \"bogus\"");
}

TEST(Presets, EachIsACompleteTextThatChangesWhatItSays) {
    ASSERT_NE(findPreset("default"), nullptr);
    for (const Preset& p : presets()) {
        const std::string text = presetSettingsText(p);
        ParameterValues values = valuesOf(text);
        EXPECT_EQ(std::count(values.begin(), values.end(), -777), 0) << p.name << ": every entry present";
        const ParameterValues defaults = defaultParameterValues();
        std::size_t differences = 0;
        for (std::size_t i = 0; i < values.size(); ++i) differences += values[i] != defaults[i];
        std::size_t realChanges = 0;
        for (const PresetChange& c : p.changes) realChanges += defaults[indexOf(c.parameter)] != c.value;
        EXPECT_EQ(differences, realChanges) << p.name;
        EXPECT_EQ(differences == 0, std::string(p.name) == "default") << p.name;
    }
}

TEST(Rectangle, ParsesFourIntegersWithArea) {
    const auto s = parseRectangle("1,2,3,4", "selection");
    EXPECT_EQ((std::array{s.x, s.y, s.width, s.height}), (std::array{1, 2, 3, 4}));
    for (const char* bad : {"1,2,3", "1,2,3,4,5", "1;2;3;4", "a,b,c,d", "1,2,0,4", "1,2,3,-1", "1,2,3,4 x"})
        EXPECT_THROW(parseRectangle(bad, "selection"), UsageError) << bad;
}

class Planning : public ::testing::Test {
protected:
    void SetUp() override {
        folder_ = fs::temp_directory_path() / "noctiva-cli-plan";
        fs::remove_all(folder_);
        fs::create_directories(folder_ / "out");
        fs::create_directories(folder_ / "a");
        fs::create_directories(folder_ / "b");
        for (const char* name : {"a/x.png", "b/x.png", "a/y.tif"}) std::ofstream(folder_ / name) << "x";
    }
    std::string p(const char* name) const { return (folder_ / name).string(); }
    fs::path folder_;
};

TEST_F(Planning, MapsInputsToOutputsAndRefusesOverwritesAndCollisions) {
    CommandOptions o;
    o.inputs = {p("a/x.png"), p("a/y.tif")};
    o.output = p("out");
    auto jobs = planJobs(o);
    ASSERT_EQ(jobs.size(), 2u);
    EXPECT_EQ(jobs[1].output, folder_ / "out" / "y.tif");

    o.output = p("out/") ;
    EXPECT_EQ(planJobs(o).size(), 2u);

    const auto refused = [](const CommandOptions& o, const std::string& reason) {
        expectUsageError([&] { planJobs(o); }, reason);
    };
    o.output = p("out/single.png");
    refused(o, "several inputs need -o to name an existing folder");
    o.output = p("missing/");
    refused(o, "no such folder");
    o.inputs = {p("a/x.png"), p("b/x.png")};
    o.output = p("out");
    refused(o, "two inputs would both be written here");
    o.inputs = {p("a/x.png")};
    o.output = p("b/../a/x.png");
    refused(o, "this is the input; use --in-place");
    o.output = p("a");
    refused(o, "this is the input");
    o.output.clear();
    refused(o, "-o OUT is required");
    o.inPlace = true;
    jobs = planJobs(o);
    ASSERT_EQ(jobs.size(), 1u);
    EXPECT_EQ(jobs[0].output, jobs[0].input);
    o.output = p("out");
    refused(o, "--in-place and -o exclude each other");
    o = {};
    o.inputs = {p("a/x.png"), p("a/y.tif")};
    o.output = p("out");
    o.compare = p("c.png");
    refused(o, "--compare and --save-par1 take a single input");
    o.inputs.clear();
    refused(o, "no input image");
}

}  // namespace
