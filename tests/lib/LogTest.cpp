#include <gtest/gtest.h>

#include "lib/debug/Log.h"
#include "lib/debug/LogCapture.h"

namespace {

using vek::debug::Level;

TEST(Log, SinksSeeEveryRecordWhateverTheConsoleLevel) {
    vek::debug::setConsoleLevel(Level::Off);
    vek::debug::LogCapture capture;
    VEK_LOG(Level::Debug, "Here", "quiet detail");
    VEK_LOG(Level::Warning, "Here", "a warning");
    const auto entries = capture.entries();
    ASSERT_EQ(entries.size(), 2u);
    EXPECT_EQ(entries[0].level, Level::Debug);
    EXPECT_EQ(entries[1].file, "Here");
    EXPECT_GT(entries[1].line, 0);
    EXPECT_EQ(capture.warnings(), std::vector<std::string>{"a warning"});
}

TEST(Log, AssertionsCarryTheExpressionAndAStackTrace) {
    vek::debug::LogCapture capture;
    const int value = 3;
    EXPECT_TRUE(VEK_CHECK("Here", value == 3));
    EXPECT_FALSE(VEK_CHECK("Here", value == 4));
    const auto entries = capture.entries();
    ASSERT_EQ(entries.size(), 1u);
    EXPECT_TRUE(entries[0].assertion);
    EXPECT_EQ(entries[0].level, Level::Error);
    EXPECT_EQ(entries[0].message, "value == 4");
    EXPECT_FALSE(entries[0].stackTrace.empty());
}

TEST(Log, CapturesEndWithTheirScopeAndNestedOnesBothListen) {
    vek::debug::LogCapture outer;
    {
        vek::debug::LogCapture inner;
        VEK_LOG(Level::Info, "Here", "both");
        EXPECT_EQ(inner.messages(Level::Info).size(), 1u);
    }
    VEK_LOG(Level::Info, "Here", "outer only");
    EXPECT_EQ(outer.messages(Level::Info), (std::vector<std::string>{"both", "outer only"}));
}

TEST(Log, AFaultySinkDoesNotReachTheCaller) {
    vek::debug::ScopedSink throwing([](const vek::debug::Record&) { throw std::runtime_error("sink"); });
    vek::debug::LogCapture capture;
    EXPECT_NO_THROW(VEK_LOG(Level::Error, "Here", "still logged"));
    EXPECT_EQ(capture.messages(Level::Error).size(), 1u);
}

}  // namespace
