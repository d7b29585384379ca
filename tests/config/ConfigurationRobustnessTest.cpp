// Malformed input of every kind: the store never throws, never crashes, and a failed load
// leaves it as it was.
#include <gtest/gtest.h>

#include <random>

#include "config/Configuration.h"
#include "lib/TestFiles.h"
#include "lib/debug/LogCapture.h"

namespace {

using vek::debug::LogCapture;
using vek::plugin_common::Configuration;
using vek::testing::TempDir;
using vek::testing::writeFile;
using vek::text::FastString;

std::string stateOf(Configuration& c) {
    return c.getConfigurationFileName().str() + "|" + c.getConfigurationName().str() + "|" +
           c.getConfigurationVersion().str() + "|" + c.serialize().str();
}

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

TEST(ConfigurationRobustness, BinaryGarbageNeverCrashesOrThrows) {
    LogCapture quiet;
    TempDir dir;
    std::mt19937 random(4711);
    const std::string prefixes[] = {"", "<configuration>", "<configuration><group name=\"g\"><key name=\"",
                                    "<configuration><group name=\"g\"><key name=\"k\" type=\"float_array\"><float value=\""};
    for (int round = 0; round < 400; ++round) {
        std::string garbage(random() % 2048, '\0');
        for (char& c : garbage) c = static_cast<char>(random());
        loadChecked(dir, prefixes[round % 4] + garbage);
    }
    // Garbage inside well-formed markup loads as whatever bytes it is, or is refused.
    std::string bytes;
    for (int c = 1; c < 256; ++c)
        if (c != '"' && c != '<' && c != '&') bytes.push_back(static_cast<char>(c));
    EXPECT_TRUE(loadChecked(dir, "<configuration><group name=\"g\"><key name=\"k\" type=\"string\" value=\"" + bytes +
                                     "\"/></group></configuration>"));
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
