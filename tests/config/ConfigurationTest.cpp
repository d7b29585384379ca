#include <gtest/gtest.h>

#include <functional>

#include "config/Configuration.h"
#include "lib/debug/LogCapture.h"

namespace {

using vek::debug::LogCapture;
using vek::plugin_common::Configuration;
using vek::text::FastString;
using vek::time::Timestamp;
using Strings = std::vector<std::string>;
using Names = std::vector<FastString>;

TEST(Configuration, GroupsKeepOrderAndMayShareNames) {
    LogCapture log;
    Configuration c;
    EXPECT_EQ(c.addGroup("ui"), 0);
    EXPECT_EQ(c.addGroup("paths"), 1);
    EXPECT_EQ(c.addGroup("ui"), 2);
    EXPECT_EQ(c.addGroup(""), -1);
    EXPECT_EQ(log.assertions(), Strings{"!groupName.empty()"});

    EXPECT_EQ(c.getGroupIndex("paths"), 1);
    EXPECT_EQ(c.getGroupIndex("ui"), -2);
    EXPECT_EQ(c.getGroupIndex("UI"), -1);  // case matters
    EXPECT_EQ(c.getGroupIndex(""), -1);
    EXPECT_EQ(c.getGroupNames(), (Names{"ui", "paths", "ui"}));

    // Name access to a shared name fails, index access works.
    EXPECT_FALSE(c.setProperty("ui", "language", "de"));
    EXPECT_FALSE(c.removeGroup("ui"));
    EXPECT_TRUE(c.setProperty(2, "language", "fr"));
    EXPECT_EQ(c.getPropertyAsString(2, "language"), "fr");
    EXPECT_EQ(c.getPropertyAsString("ui", "language", "none"), "none");
    EXPECT_FALSE(c.hasProperty("ui", "language"));
    EXPECT_TRUE(c.hasProperty(2, "language"));

    EXPECT_TRUE(c.removeGroup(0));
    EXPECT_EQ(c.getGroupIndex("ui"), 1);
    EXPECT_EQ(c.getPropertyAsString("ui", "language"), "fr");  // the list moved with its name
    EXPECT_FALSE(c.removeGroup(5));
    EXPECT_FALSE(c.removeGroup(-1));
    EXPECT_TRUE(c.removeGroup("paths"));
    EXPECT_EQ(c.getGroupName(0), "ui");
}

TEST(Configuration, SettersCheckNameGroupAndIndex) {
    LogCapture log;
    Configuration c;
    EXPECT_FALSE(c.setProperty("g", "p", 1, false));  // no group and not asked to create it
    EXPECT_EQ(c.getGroupIndex("g"), -1);
    EXPECT_TRUE(c.setProperty("g", "p", 1));
    EXPECT_TRUE(c.setProperty("g", "p", 2));  // replaces
    EXPECT_EQ(c.getPropertyAsInt("g", "p"), 2);
    EXPECT_EQ(c.getPropertyNames("g").size(), 1u);
    log.clear();

    EXPECT_FALSE(c.setProperty("g", "", 1));
    EXPECT_FALSE(c.setProperty(7, "p", 1));
    EXPECT_FALSE(c.setProperty(-1, "p", 1));
    EXPECT_EQ(log.assertions(), (Strings{"!propertyName.empty()", "groupIndex < _groupsPropertyLists.size()",
                                         "groupIndex < _groupsPropertyLists.size()"}));
    EXPECT_EQ(c.getGroupName(3), "");
    c.setProperty("g", "s", "text");  // a literal must not be taken for a bool
    EXPECT_EQ(c.getPropertyAsString("g", "s"), "text");
}

// Each getter, asked for a property holding another type, gives its default and logs its text.
TEST(Configuration, GettersNeverConvertAndSayWhy) {
    Configuration c;
    c.setProperty("g", "int", int32_t{-5});
    c.setProperty("g", "str", "x");
    struct Case {
        std::function<bool(const Configuration&, const char*)> returnsDefault;
        const char* property;
        const char* type;
    };
    const Case cases[] = {
        {[](auto& c, auto p) { return c.getPropertyAsInt("g", p, 42) == 42; }, "str", "int"},
        {[](auto& c, auto p) { return c.getPropertyAsUnsignedInt("g", p, 42u) == 42u; }, "int", "unsigned int"},
        {[](auto& c, auto p) { return c.getPropertyAsLong("g", p, 42L) == 42L; }, "int", "long"},
        {[](auto& c, auto p) { return c.getPropertyAsFloat("g", p, 4.5f) == 4.5f; }, "int", "float"},
        {[](auto& c, auto p) { return c.getPropertyAsDouble("g", p, 4.5) == 4.5; }, "int", "double"},
        {[](auto& c, auto p) { return c.getPropertyAsBool("g", p, true); }, "int", "bool"},
        {[](auto& c, auto p) { return c.getPropertyAsString("g", p, "d") == "d"; }, "int", "vek::utf8string"},
        {[](auto& c, auto p) { return c.getPropertyAsFloatArray("g", p, {1.f}) == std::vector<float>{1.f}; }, "int",
         "std::vector<float>"},
        {[](auto& c, auto p) { return c.getPropertyAsStringArray("g", p, {"d"}).size() == 1; }, "int",
         "std::vector<vek::utf8string>"},
        {[](auto& c, auto p) {
             return c.getPropertyAsTimestamp("g", p, Timestamp::fromSecondsSinceEpoch(9)).secondsSinceEpoch() == 9;
         },
         "missing", "Timestamp"},
    };
    for (const Case& k : cases) {
        const std::string warning = std::string("Couldn't convert (boost::any_cast) the property '") + k.property +
                                    "' to " + k.type + ".";
        LogCapture log;
        EXPECT_TRUE(k.returnsDefault(c, k.property)) << warning;
        EXPECT_EQ(log.warnings(), Strings{warning});
        EXPECT_EQ(log.assertions().size(), 1u) << warning;
    }
}

TEST(Configuration, PropertyNamesSortBySignedBytes) {
    Configuration c;
    for (const char* name : {"b", "ab", "a", "B", "_", "\xC3\xA9t\xC3\xA9", "A1"}) c.setProperty("g", name, true);
    // Bytes from 0x80 up are negative and come first; a prefix precedes its extensions.
    EXPECT_EQ(c.getPropertyNames("g"), (Names{"\xC3\xA9t\xC3\xA9", "A1", "B", "_", "a", "ab", "b"}));
    EXPECT_TRUE(c.removeProperty("g", "ab"));
    EXPECT_FALSE(c.removeProperty("g", "ab"));
    EXPECT_FALSE(c.removeProperty("nope", "a"));
    EXPECT_EQ(c.getPropertyNames("g").size(), 6u);
}

TEST(Configuration, ClearAllKeepsIdentity) {
    Configuration c;
    ASSERT_TRUE(c.deserialize(FastString("<prefs version=\"3\"><group name=\"g\"/></prefs>")));
    c.clearAll();
    EXPECT_TRUE(c.getGroupNames().empty());
    EXPECT_EQ(c.getConfigurationName(), "prefs");
    EXPECT_EQ(c.getConfigurationVersion(), "3");
}

TEST(Configuration, CopyingConstructorCopiesDeeply) {
    auto original = std::make_shared<Configuration>();
    ASSERT_TRUE(original->deserialize(FastString("<prefs version=\"3\"><group name=\"g\"/></prefs>")));
    original->setProperty("g", "list", std::vector<FastString>{"a", "b"});
    Configuration copy(original);
    EXPECT_EQ(copy.serialize(), original->serialize());
    copy.setProperty("g", "list", std::vector<FastString>{"c"});
    EXPECT_EQ(original->getPropertyAsStringArray("g", "list").size(), 2u);

    LogCapture log;
    Configuration fromNull{std::shared_ptr<const Configuration>()};
    EXPECT_EQ(log.assertions().size(), 1u);
    EXPECT_EQ(fromNull.getConfigurationName(), "configuration");
}

}  // namespace
