#include <gtest/gtest.h>

#include "lib/text/FastString.h"
#include "lib/text/Format.h"
#include "lib/text/Utf.h"
#include "lib/time/Timestamp.h"

namespace {

using vek::text::FastString;

TEST(FastString, WideRoundTripKeepsEveryPlane) {
    const std::string samples[] = {"", "plain", "Grüße", "日本語", "emoji 🎉 and 𝄞", "\x7f\xc2\x80\xef\xbf\xbf\xf4\x8f\xbf\xbf"};
    for (const std::string& s : samples) {
        const FastString f(s);
        EXPECT_TRUE(f.isValidUtf8()) << s;
        EXPECT_EQ(FastString::fromWide(f.toWide()), f) << s;
    }
    EXPECT_EQ(FastString("🎉").toWide(), std::wstring(L"\U0001F389"));
    const std::wstring loneSurrogate{wchar_t(0xD800), L'x'};
    EXPECT_EQ(vek::text::wideToUtf8(loneSurrogate), "\xEF\xBF\xBDx");
}

TEST(FastString, MalformedUtf8BecomesReplacementCharacters) {
    struct Case {
        std::string bytes;
        std::wstring wide;
    };
    const Case cases[] = {
        {"\x80", L"\xFFFD"},                          // stray continuation byte
        {"\xC0\x80", L"\xFFFD\xFFFD"},                // overlong NUL
        {"\xED\xA0\x80", L"\xFFFD\xFFFD\xFFFD"},      // UTF-16 surrogate
        {"\xF4\x90\x80\x80", L"\xFFFD\xFFFD\xFFFD\xFFFD"},  // past U+10FFFF
        {"a\xE2\x82", L"a\xFFFD\xFFFD"},             // truncated at the end
        {"\xE2(a", L"\xFFFD(a"},                     // bad continuation
    };
    for (const Case& c : cases) {
        EXPECT_FALSE(vek::text::isValidUtf8(c.bytes));
        EXPECT_EQ(vek::text::utf8ToWide(c.bytes), c.wide);
    }
}

TEST(FastString, ComparesAndSearchesBytes) {
    const FastString s("Error: Couldn't convert");
    EXPECT_TRUE(s.contains("Couldn't convert"));
    EXPECT_TRUE(s.startsWith("Error"));
    EXPECT_TRUE(s.endsWith("convert"));
    EXPECT_TRUE(FastString("GrOuP").equalsIgnoreAsciiCase("group"));
    EXPECT_FALSE(FastString("groups").equalsIgnoreAsciiCase("group"));
    EXPECT_EQ(FastString("a") + "b", FastString("ab"));
    EXPECT_LT(FastString("a"), FastString("ab"));
    EXPECT_EQ(FastString(static_cast<const char*>(nullptr)), FastString());
    const std::string withNul("a\0b", 3);
    EXPECT_EQ(FastString(withNul).size(), 3u);
}

TEST(FormatMessage, FillsPositionalAndSequentialMarkers) {
    using vek::text::formatMessage;
    EXPECT_EQ(formatMessage("'%1'! Exception was %2", {"f", "e"}), "'f'! Exception was e");
    EXPECT_EQ(formatMessage("'%*' to '%*'", {"v", "t"}), "'v' to 't'");
    EXPECT_EQ(formatMessage("%2 %1", {"a", "b"}), "b a");
    EXPECT_EQ(formatMessage("100%% and %3 and %", {"a"}), "100% and %3 and %");
    EXPECT_EQ(formatMessage("%1", {"%2"}), "%2");  // arguments are not expanded again
}

TEST(Timestamp, HoldsTimesPast2038AndClampsFarOnes) {
    using vek::time::Timestamp;
    const auto t = Timestamp::fromSecondsSinceEpoch(4102444800);  // 2100-01-01
    EXPECT_EQ(Timestamp::fromTimePoint(t.toTimePoint()), t);
    const auto far = Timestamp::fromSecondsSinceEpoch(INT64_MAX);
    EXPECT_GT(far.toTimePoint(), t.toTimePoint());  // clamped, not wrapped
    const auto now = Timestamp::now();
    EXPECT_GT(now.secondsSinceEpoch(), 1600000000);
    EXPECT_LT(Timestamp(), now);
}

}  // namespace
