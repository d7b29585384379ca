// Parameters on their own: change detection by snapshot, reading an entry, raw byte entries. The
// settings text as a whole (numbering, missing entries, bounded writes) is tested on the shadow chain.
#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "kernel/Parameter.h"

using VEK_STD::cIntParameter;
using VEK_STD::cParameter;
using VEK_STD::cParameterSet;

namespace {

TEST(Parameter, ChangeIsAByteComparisonWithTheSnapshot) {
    int32_t field = 0;
    cIntParameter p(&field, true);
    EXPECT_FALSE(p.HasChanged());  // the snapshot starts at zero
    field = 7;
    EXPECT_TRUE(p.HasChanged());
    p.AcceptChanges();
    EXPECT_FALSE(p.HasChanged());
    EXPECT_TRUE(p.Watches(&field));
    int32_t other = 0;
    EXPECT_FALSE(p.Watches(&other));
}

TEST(Parameter, ReadParsesStrtolStyleAndMovesTheCursorPastTheName) {
    struct Case {
        const char* text;
        int32_t expected;
    };
    const Case cases[] = {
        {" Parameter0 -3 ", -3},     {" Parameter0    42 ", 42}, {" Parameter0 +9 ", 9},
        {" Parameter0 x ", 0},       {"Parameter0 12abc", 12},  {" Parameter0 99999999999 ", 2147483647},
        {" Parameter0 -99999999999 ", -2147483647 - 1},
        {" Parameter0", 0},  // the name ends the text: the value parse sees only the terminator
    };
    for (const auto& tc : cases) {
        SCOPED_TRACE(tc.text);
        int32_t field = 1234;
        cIntParameter p(&field, true);
        int32_t counter = 0;
        const char* cursor = tc.text;
        p.Read(tc.text, cursor, counter);
        EXPECT_EQ(field, tc.expected);
        EXPECT_EQ(counter, 1);
        EXPECT_EQ(cursor, std::strstr(tc.text, "Parameter0") + 10);
    }
}

TEST(Parameter, RawBytesAreEscapedAndReadBack) {
    uint8_t bytes[8] = {0, '"', '\\', 'a', 0, 255, ' ', 1};
    cParameter p(bytes, sizeof bytes, true, "Raw");
    char buffer[64] = {};
    char* cursor = buffer;
    int32_t counter = 0;
    p.Write(buffer, sizeof buffer, cursor, counter);
    EXPECT_EQ(std::string(buffer), std::string(" Raw \"\\0\\\"\\\\a\\0\xff \x01\" "));
    EXPECT_LE(std::strlen(buffer), p.TextLength());

    uint8_t back[8] = {9, 9, 9, 9, 9, 9, 9, 9};
    cParameter q(back, sizeof back, true, "Raw");
    const char* in = buffer;
    counter = 0;
    q.Read(buffer, in, counter);
    EXPECT_EQ(std::memcmp(back, bytes, sizeof bytes), 0);
    EXPECT_EQ(*in, ' ');
}

TEST(Parameter, RawReadNeverWritesMoreThanItsSize) {
    const uint8_t guard[4] = {0xAA, 0xAA, 0xAA, 0xAA};
    struct {
        uint8_t t[4];
        uint8_t g[4];
    } mem{{}, {0xAA, 0xAA, 0xAA, 0xAA}};
    cParameter p(mem.t, 4, true, "Raw");
    const char* text = " Raw \"abcdefghij\" ";
    const char* cursor = text;
    int32_t counter = 0;
    p.Read(text, cursor, counter);
    EXPECT_EQ(std::memcmp(mem.t, "abcd", 4), 0);
    EXPECT_EQ(std::memcmp(mem.g, guard, 4), 0);
    // An unterminated quote stops at the text's end.
    const char* open = " Raw \"xy";
    cursor = open;
    p.Read(open, cursor, counter);
    EXPECT_EQ(*cursor, '\0');
}

}  // namespace
