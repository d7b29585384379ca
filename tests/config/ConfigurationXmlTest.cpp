// Reading and writing the configuration format: round trips, the written form, lenient reading,
// and malformed input of every kind (never a throw or crash; a failed load leaves the store as it was).
#include <gtest/gtest.h>

#include <algorithm>
#include <bit>
#include <cfloat>
#include <climits>
#include <cmath>

#include "config/Configuration.h"
#include "lib/TestFiles.h"
#include "lib/debug/LogCapture.h"
#include "lib/xml/XmlDocumentRapid.h"

namespace {

using vek::debug::LogCapture;
using vek::plugin_common::Configuration;
using vek::testing::readFile;
using vek::testing::TempDir;
using vek::testing::writeFile;
using vek::text::FastString;
using vek::time::Timestamp;
using Strings = std::vector<std::string>;

const std::vector<float> kFloats{10.0000105f, -0.0f, FLT_TRUE_MIN, FLT_MAX, -1.0f / 3.0f, 0.1f};
const std::vector<FastString> kStrings{"", "Grüße, 日本語 🎉", "<a href=\"x\">&amp;</a>", " padded\n\ttabs\r ", "'"};

void fillEveryType(Configuration& c) {
    c.setProperty("numbers", "int", int32_t{INT32_MIN});
    c.setProperty("numbers", "uint", uint32_t{UINT32_MAX});
    c.setProperty("numbers", "long", long{-1234567890L});
    c.setProperty("numbers", "float", 10.0000105f);
    c.setProperty("numbers", "double", 0.1 + 0.2);
    c.setProperty("numbers", "tiny", DBL_TRUE_MIN);
    c.setProperty("numbers", "negative", -2.5e-300);
    c.setProperty("flags", "yes", true);
    c.setProperty("flags", "no", false);
    c.setProperty("text", "empty", FastString());
    c.setProperty("text", "unicode", kStrings[1]);
    c.setProperty("text", "markup", kStrings[2]);
    c.setProperty("text", "blanks", kStrings[3]);
    c.setProperty("arrays", "floats", kFloats);
    c.setProperty("arrays", "noFloats", std::vector<float>{});
    c.setProperty("arrays", "strings", kStrings);
    c.setProperty("times", "after2038", Timestamp::fromSecondsSinceEpoch(4102444800));  // 2100
    c.setProperty("times", "before1970", Timestamp::fromSecondsSinceEpoch(-86400));
}

void expectEveryType(const Configuration& c) {
    LogCapture log;
    EXPECT_EQ(c.getPropertyAsInt("numbers", "int"), INT32_MIN);
    EXPECT_EQ(c.getPropertyAsUnsignedInt("numbers", "uint"), UINT32_MAX);
    EXPECT_EQ(c.getPropertyAsLong("numbers", "long"), -1234567890L);
    EXPECT_EQ(std::bit_cast<uint32_t>(c.getPropertyAsFloat("numbers", "float")), std::bit_cast<uint32_t>(10.0000105f));
    EXPECT_EQ(std::bit_cast<uint64_t>(c.getPropertyAsDouble("numbers", "double")), std::bit_cast<uint64_t>(0.1 + 0.2));
    EXPECT_EQ(c.getPropertyAsDouble("numbers", "tiny"), DBL_TRUE_MIN);
    EXPECT_EQ(c.getPropertyAsDouble("numbers", "negative"), -2.5e-300);
    EXPECT_TRUE(c.getPropertyAsBool("flags", "yes"));
    EXPECT_FALSE(c.getPropertyAsBool("flags", "no", true));
    EXPECT_EQ(c.getPropertyAsString("text", "empty", "default"), "");
    EXPECT_EQ(c.getPropertyAsString("text", "unicode"), kStrings[1]);
    EXPECT_EQ(c.getPropertyAsString("text", "markup"), kStrings[2]);
    EXPECT_EQ(c.getPropertyAsString("text", "blanks"), kStrings[3]);
    const auto floats = c.getPropertyAsFloatArray("arrays", "floats");
    ASSERT_EQ(floats.size(), kFloats.size());
    for (size_t i = 0; i < floats.size(); ++i)
        EXPECT_EQ(std::bit_cast<uint32_t>(floats[i]), std::bit_cast<uint32_t>(kFloats[i])) << i;
    EXPECT_TRUE(c.getPropertyAsFloatArray("arrays", "noFloats", {1.0f}).empty());
    EXPECT_EQ(c.getPropertyAsStringArray("arrays", "strings"), kStrings);
    EXPECT_EQ(c.getPropertyAsTimestamp("times", "after2038").secondsSinceEpoch(), 4102444800);
    EXPECT_EQ(c.getPropertyAsTimestamp("times", "before1970").secondsSinceEpoch(), -86400);
    EXPECT_TRUE(log.entries().empty());
}

TEST(ConfigurationXml, EveryTypeRoundTripsThroughTextAndFile) {
    TempDir dir;
    Configuration original;
    fillEveryType(original);
    expectEveryType(original);

    Configuration fromText;
    ASSERT_TRUE(fromText.deserialize(original.serialize()));
    expectEveryType(fromText);

    const FastString path((dir / "every.xml").string());
    ASSERT_TRUE(original.writeToFile(path, false));
    EXPECT_EQ(original.getConfigurationFileName(), path);
    Configuration fromFile(path);
    EXPECT_EQ(fromFile.getConfigurationFileName(), path);
    expectEveryType(fromFile);
    EXPECT_EQ(fromFile.serialize(), original.serialize());  // stable: a second pass changes nothing
}

TEST(ConfigurationXml, WritesTheDocumentedFormat) {
    Configuration c;
    c.setProperty("g", "flag", true);
    c.setProperty("g", "off", false);
    c.setProperty("g", "list", std::vector<FastString>{"x"});
    c.setProperty("g", "curve", std::vector<float>{0.5f});
    c.setProperty("g", "when", Timestamp::fromSecondsSinceEpoch(4294967296));
    c.setProperty("g", "count", uint32_t{3000000000u});
    EXPECT_EQ(c.serialize(),
              "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
              "<configuration>\n"
              "\t<group name=\"g\">\n"
              "\t\t<key name=\"count\" type=\"unsigned int\" value=\"3000000000\"/>\n"
              "\t\t<key name=\"curve\" type=\"float_array\">\n"
              "\t\t\t<float value=\"0.5\"/>\n"
              "\t\t</key>\n"
              "\t\t<key name=\"flag\" type=\"bool\" value=\"1\"/>\n"
              "\t\t<key name=\"list\" type=\"string_array\">\n"
              "\t\t\t<string value=\"x\"/>\n"
              "\t\t</key>\n"
              "\t\t<key name=\"off\" type=\"bool\" value=\"0\"/>\n"
              "\t\t<key name=\"when\" type=\"timestamp\" value=\"4294967296\"/>\n"
              "\t</group>\n"
              "</configuration>\n");
}

TEST(ConfigurationXml, TwoGroupsOfOneNameSurviveAFile) {
    TempDir dir;
    Configuration c;
    c.setProperty(c.addGroup("dup"), "n", 1);
    c.setProperty(c.addGroup("dup"), "n", 2);
    ASSERT_TRUE(c.writeToFile(FastString((dir / "dup.xml").string()), false));
    Configuration back(FastString((dir / "dup.xml").string()));
    EXPECT_EQ(back.getGroupIndex("dup"), -2);
    EXPECT_EQ(back.getPropertyAsInt(0, "n"), 1);
    EXPECT_EQ(back.getPropertyAsInt(1, "n"), 2);
}

TEST(ConfigurationXml, AdoptsAForeignRootNameAndWritesItBack) {
    Configuration c;
    ASSERT_TRUE(c.deserialize(FastString("<Preferences><group name=\"g\"><key name=\"a\" type=\"int\" value=\"7\"/></group></Preferences>")));
    EXPECT_EQ(c.getConfigurationName(), "Preferences");
    EXPECT_EQ(c.getPropertyAsInt("g", "a"), 7);
    const auto doc = c.createXMLDoc();
    ASSERT_TRUE(doc);
    EXPECT_EQ(doc->root().name(), "Preferences");
}

TEST(ConfigurationXml, ReadsGroupsInAnyCaseSkipsOtherChildrenAndAnyPropertyElement) {
    Configuration c;
    ASSERT_TRUE(c.deserialize(FastString(
        "<configuration>"
        "<GROUP name=\"upper\"><entry name=\"a\" type=\"int\" value=\"1\"/></GROUP>"
        "<comment name=\"skipped\"><key name=\"b\" type=\"int\" value=\"2\"/></comment>"
        "<Group name=\"mixed\"><property name=\"c\" type=\"double\" value=\"2.5\"/>text</Group>"
        "</configuration>")));
    EXPECT_EQ(c.getGroupNames(), (std::vector<FastString>{"upper", "mixed"}));
    EXPECT_EQ(c.getPropertyAsInt("upper", "a"), 1);
    EXPECT_EQ(c.getPropertyAsDouble("mixed", "c"), 2.5);
    const std::string text = c.serialize().str();
    EXPECT_NE(text.find("<group name=\"upper\">"), std::string::npos);
    EXPECT_NE(text.find("<key name=\"c\" type=\"double\" value=\"2.5\"/>"), std::string::npos);
    EXPECT_EQ(text.find("entry"), std::string::npos);
    EXPECT_EQ(text.find("skipped"), std::string::npos);
}

// Everything a store shows, for before/after comparisons.
std::string stateOf(Configuration& c) {
    return c.getConfigurationFileName().str() + "|" + c.getConfigurationName().str() + "|" +
           c.getConfigurationVersion().str() + "|" + c.serialize().str();
}

TEST(ConfigurationXml, AFailedLoadLeavesTheStoreExactlyAsItWas) {
    TempDir dir;
    Configuration c;
    fillEveryType(c);
    ASSERT_TRUE(c.writeToFile(FastString((dir / "a.xml").string()), false));
    ASSERT_TRUE(c.deserialize(FastString("<mine version=\"5\"><group name=\"keep\"><key name=\"k\" type=\"int\" value=\"1\"/></group></mine>")));
    const std::string before = stateOf(c);

    struct Case {
        const char* xml;
        const char* warning;
    };
    const Case cases[] = {
        {"<other version=\"9\"><group name=\"g\"><key name=\"a\" type=\"int\" value=\"1\"/><key name=\"b\" value=\"2\"/></group></other>",
         "While parsing configuration XML document, found that a property has no 'name' or 'value' attribute!"},
        {"<other><group name=\"g\"><key type=\"int\" value=\"2\"/></group></other>",
         "While parsing configuration XML document, found that a property has no 'name' or 'value' attribute!"},
        {"<other><group name=\"g\"><key name=\"a\" type=\"int\"/></group></other>",
         "While parsing configuration XML document, found that a property has no 'name' or 'value' attribute!"},
        {"<other><group name=\"g\"><key name=\"a\" type=\"string_array\"><string/></key></group></other>",
         "While parsing configuration XML document, found that a property has no 'name' or 'value' attribute!"},
        {"<other><group name=\"g\"/><group/></other>",
         "While parsing configuration XML document, found that group a has no 'name' attribute!"},
    };
    for (const Case& k : cases) {
        LogCapture log;
        EXPECT_FALSE(c.deserialize(FastString(k.xml))) << k.xml;
        EXPECT_EQ(stateOf(c), before) << k.xml;
        EXPECT_EQ(log.warnings(), (Strings{k.warning, std::string("Error while parsing configuration XML document! Error was '") +
                                                           k.warning + "'."}));
    }
}

TEST(ConfigurationXml, DropsUnconvertibleValuesAndLoadsTheRest) {
    LogCapture log;
    Configuration c;
    ASSERT_TRUE(c.deserialize(FastString(
        "<configuration><group name=\"g\">"
        "<key name=\"poisoned\" type=\"string\" value=\"Couldn't convert 'x' to string.\"/>"
        "<key name=\"notANumber\" type=\"int\" value=\"abc\"/>"
        "<key name=\"tooBig\" type=\"unsigned int\" value=\"4294967296\"/>"
        "<key name=\"badList\" type=\"float_array\"><float value=\"1\"/><float value=\"x\"/></key>"
        "<key name=\"ok\" type=\"int\" value=\"5\"/>"
        "</group></configuration>")));
    EXPECT_EQ(c.getPropertyNames("g"), std::vector<FastString>{"ok"});
    EXPECT_EQ(c.getPropertyAsInt("g", "ok"), 5);
    EXPECT_EQ(log.warnings(),
              (Strings{"Tried to load a property that previously couldn't be converted to a string.",
                       "Error while trying to convert the string 'abc' to the type 'int'! Returning empty boost::any.",
                       "Error while trying to convert the string '4294967296' to the type 'unsigned int'! Returning empty "
                       "boost::any.",
                       "Error while trying to convert the string 'x' to the type 'float_array'! Returning empty boost::any."}));
    // Each dropped value also asserts when it is refused as empty.
    const Strings assertions = log.assertions();
    EXPECT_EQ(std::count(assertions.begin(), assertions.end(), "!value.empty()"), 4);
}

TEST(ConfigurationXml, ReadsTextFormsLeniently) {
    Configuration c;
    ASSERT_TRUE(c.deserialize(FastString(
        "<configuration><group name=\"g\">"
        "<key name=\"t\" type=\"bool\" value=\"true\"/>"
        "<key name=\"wrapped\" type=\"unsigned int\" value=\"-1\"/>"
        "<key name=\"custom\" type=\"colour\" value=\"#ff0000\"/>"
        "<key name=\"old\" type=\"timestamp\" value=\"4102444800\"/>"
        "</group></configuration>")));
    EXPECT_TRUE(c.getPropertyAsBool("g", "t"));
    EXPECT_EQ(c.getPropertyAsUnsignedInt("g", "wrapped"), UINT32_MAX);
    EXPECT_EQ(c.getPropertyAsString("g", "custom"), "#ff0000");  // unknown types load as strings
    EXPECT_EQ(c.getPropertyAsTimestamp("g", "old").secondsSinceEpoch(), 4102444800);
    LogCapture log;
    EXPECT_EQ(c.getPropertyAsUnsignedInt("g", "t", 17u), 17u);
    EXPECT_EQ(log.warnings(), Strings{"Couldn't convert (boost::any_cast) the property 't' to unsigned int."});
}

TEST(ConfigurationXml, VersionIsWrittenOnlyWhenSetAndKeptWhenALoadHasNone) {
    Configuration c;
    EXPECT_EQ(c.serialize().find("version=\"\""), FastString::npos);
    EXPECT_EQ(c.serialize().find("<configuration version"), FastString::npos);
    ASSERT_TRUE(c.deserialize(FastString("<configuration version=\"2.1\"/>")));
    EXPECT_EQ(c.getConfigurationVersion(), "2.1");
    ASSERT_TRUE(c.deserialize(FastString("<configuration/>")));
    EXPECT_EQ(c.getConfigurationVersion(), "2.1");
    EXPECT_NE(c.serialize().find("<configuration version=\"2.1\"/>"), FastString::npos);
}

TEST(ConfigurationXml, WritesIntoAndReadsFromAnElementOfAnotherDocument) {
    Configuration c;
    fillEveryType(c);
    vek::xml::XmlDocumentRapid host;
    auto slot = host.createRoot("project").appendChild("settings");
    c.serialize(slot);
    EXPECT_EQ(slot.attribute("name"), "configuration");

    const auto reparsed = vek::xml::XmlDocumentRapid::fromText(host.toText());
    ASSERT_TRUE(reparsed);
    Configuration back;
    ASSERT_TRUE(back.deserialize(reparsed->root().firstChild()));
    expectEveryType(back);
    EXPECT_FALSE(back.deserialize(vek::xml::XmlElement()));
}

TEST(ConfigurationXml, ANameThatIsNoElementNameStillSavesALoadableFile) {
    const auto doc = vek::xml::XmlDocumentRapid::fromText("<x name=\"my settings\"><group name=\"g\"/></x>");
    Configuration c;
    ASSERT_TRUE(c.deserialize(doc->root()));
    EXPECT_EQ(c.getConfigurationName(), "my settings");
    Configuration back;
    EXPECT_TRUE(back.deserialize(c.serialize()));
    EXPECT_EQ(back.getConfigurationName(), "configuration");
    EXPECT_EQ(back.getGroupIndex("g"), 0);
}

TEST(ConfigurationXml, AFailedSaveUnderANewPathKeepsTheOldFileName) {
    TempDir dir;
    Configuration c;
    const FastString good((dir / "good.xml").string());
    ASSERT_TRUE(c.writeToFile(good, false));
    std::filesystem::create_directory(dir / "folder.xml");
    LogCapture log;
    EXPECT_FALSE(c.writeToFile(FastString((dir / "folder.xml").string()), false));
    EXPECT_EQ(c.getConfigurationFileName(), good);
    ASSERT_EQ(log.warnings().size(), 1u);
    EXPECT_EQ(log.warnings()[0].rfind("Could not save configuration XML file '" + (dir / "folder.xml").string() +
                                          "'! Exception was ",
                                      0),
              0u);
    EXPECT_FALSE(Configuration().writeToFile(false));  // no file name yet
    EXPECT_TRUE(c.writeToFile(FastString(), false));   // an empty path keeps the current one
}

// ---- Malformed input

// A store with some content, so that an unwanted change would show.
void fill(Configuration& c) {
    c.setProperty("ui", "language", "de");
    c.setProperty("ui", "scale", 1.25);
    c.setProperty("recent", "files", std::vector<FastString>{"a.tif", "b.png"});
    c.setProperty("curve", "points", std::vector<float>{0.f, 0.25f, 1.f});
}

// Loads `text` from a file into a filled store; checks that nothing escapes and that a failed
// load changed nothing. Returns whether the load succeeded.
bool loadChecked(const TempDir& dir, const std::string& text) {
    writeFile(dir / "input.xml", text);
    Configuration c;
    fill(c);
    const std::string before = stateOf(c);
    bool loaded = false;
    EXPECT_NO_THROW(loaded = c.loadFromFile(FastString((dir / "input.xml").string())));
    if (!loaded) {
        EXPECT_EQ(stateOf(c), before);
    }
    return loaded;
}

std::string validFile() {
    Configuration c;
    fill(c);
    c.setProperty("numbers", "pi", 3.14159f);
    c.setProperty("numbers", "count", uint32_t{7});
    return c.serialize().str();
}

TEST(ConfigurationRobustness, EveryTruncationOfAFileFailsCleanly) {
    LogCapture quiet;
    TempDir dir;
    const std::string full = validFile();
    const size_t rootEnd = full.rfind("</configuration>") + std::string("</configuration>").size();
    for (size_t length = 0; length < full.size(); ++length) {
        const bool loaded = loadChecked(dir, full.substr(0, length));
        EXPECT_EQ(loaded, length >= rootEnd) << "cut at " << length;
    }
    EXPECT_TRUE(loadChecked(dir, full));
}

TEST(ConfigurationRobustness, DeepNestingIsRefusedWithoutExhaustingTheStack) {
    LogCapture quiet;
    TempDir dir;
    std::string deep = "<configuration><group name=\"g\">";
    for (int i = 0; i < 200000; ++i) deep += "<key name=\"k\" type=\"string_array\">";
    EXPECT_FALSE(loadChecked(dir, deep + "</key>"));
    // Moderate depth below a property is legal XML and simply not looked into.
    std::string moderate = "<configuration><group name=\"g\"><key name=\"k\" type=\"string_array\"><string value=\"a\">";
    for (int i = 0; i < 100; ++i) moderate += "<x>";
    for (int i = 0; i < 100; ++i) moderate += "</x>";
    EXPECT_TRUE(loadChecked(dir, moderate + "</string></key></group></configuration>"));
}

TEST(ConfigurationRobustness, HugeAttributeValuesRoundTrip) {
    TempDir dir;
    const FastString big(std::string(4u << 20, 'v'));
    Configuration c;
    c.setProperty("g", "big", big);
    c.setProperty("g", "bigList", std::vector<FastString>(3, big));
    const FastString path((dir / "big.xml").string());
    ASSERT_TRUE(c.writeToFile(path, false));
    Configuration back(path);
    EXPECT_TRUE(back.getPropertyAsString("g", "big") == big);  // not EXPECT_EQ: it would print 4 MiB
    EXPECT_EQ(back.getPropertyAsStringArray("g", "bigList").size(), 3u);
    // A huge name attribute in an otherwise broken file is refused like any other.
    EXPECT_FALSE(loadChecked(dir, "<configuration><group name=\"" + std::string(8u << 20, 'n') + "\">"));
}

TEST(ConfigurationRobustness, MissingFilesAndFoldersInTheWayFailWithAWarning) {
    TempDir dir;
    writeFile(dir / "plain", "not a folder");
    std::filesystem::create_directory(dir / "folder.cfg");
    const std::string unreadable[] = {(dir / "missing.cfg").string(), (dir / "folder.cfg").string(),
                                      (dir / "plain" / "below.cfg").string()};
    for (const std::string& path : unreadable) {
        LogCapture log;
        Configuration c;
        fill(c);
        const std::string before = stateOf(c);
        EXPECT_FALSE(c.loadFromFile(FastString(path))) << path;
        EXPECT_EQ(stateOf(c), before);
        ASSERT_EQ(log.warnings().size(), 1u);
        EXPECT_EQ(log.warnings()[0].rfind("Could not load configuration XML file '" + path + "'! Exception was ", 0), 0u)
            << log.warnings()[0];
        EXPECT_FALSE(c.writeToFile(FastString(path == unreadable[0] ? (dir / "plain" / "x.cfg").string() : path), false));
    }
    LogCapture log;
    writeFile(dir / "broken.cfg", "<configuration><group>");
    EXPECT_FALSE(Configuration().loadFromFile(FastString((dir / "broken.cfg").string())));
    EXPECT_EQ(log.warnings(),
              std::vector<std::string>{"Could not load configuration XML file '" + (dir / "broken.cfg").string() + "'!"});
}

}  // namespace
