// Parameters on their own: change detection by snapshot, the text entries, bounded writes.
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

TEST(Parameter, IntEntriesAreNumberedByTheCounter) {
    int32_t a = 5, b = -3, c = 2147483647;
    cParameterSet set;
    set.Add(new cIntParameter(&a, true));
    set.Add(new cIntParameter(&b, true));
    set.Add(new cIntParameter(&c, false));  // not in the text, does not count
    int32_t counter = 7;
    auto text = set.WriteToNewBuffer(counter);
    EXPECT_STREQ(text.get(), " Parameter7 5  Parameter8 -3 ");
    EXPECT_EQ(counter, 9);
    EXPECT_LE(std::strlen(text.get()), set.TextLength());
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

TEST(Parameter, MissingNameKeepsFieldAndCursorButCounts) {
    int32_t field = 77;
    cIntParameter p(&field, true);
    const char* text = " Parameter1 5 ";
    const char* cursor = text;
    int32_t counter = 0;
    p.Read(text, cursor, counter);
    EXPECT_EQ(field, 77);
    EXPECT_EQ(cursor, text);
    EXPECT_EQ(counter, 1);
}

TEST(Parameter, ReadAtTheEndOfTheTextStopsAtTheTerminator) {
    // The name ends the text: the value parse sees only the terminator.
    std::string text = " Parameter0";
    int32_t field = 5;
    cIntParameter p(&field, true);
    const char* cursor = text.c_str();
    int32_t counter = 0;
    p.Read(text.c_str(), cursor, counter);
    EXPECT_EQ(field, 0);
    EXPECT_EQ(*cursor, '\0');
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
    uint8_t target[4] = {};
    uint8_t guard[4] = {0xAA, 0xAA, 0xAA, 0xAA};
    struct {
        uint8_t t[4];
        uint8_t g[4];
    } mem{};
    std::memcpy(mem.g, guard, 4);
    cParameter p(mem.t, 4, true, "Raw");
    const char* text = " Raw \"abcdefghij\" ";
    const char* cursor = text;
    int32_t counter = 0;
    p.Read(text, cursor, counter);
    EXPECT_EQ(std::memcmp(mem.t, "abcd", 4), 0);
    EXPECT_EQ(std::memcmp(mem.g, guard, 4), 0);
    (void)target;
    // An unterminated quote stops at the text's end.
    const char* open = " Raw \"xy";
    cursor = open;
    p.Read(open, cursor, counter);
    EXPECT_EQ(*cursor, '\0');
}

TEST(Parameter, BoundedWriteDropsWholeEntriesAndStaysTerminated) {
    int32_t values[3] = {1, -22, 333};
    cParameterSet set;
    for (auto& v : values) set.Add(new cIntParameter(&v, true));
    const std::string full = " Parameter0 1  Parameter1 -22  Parameter2 333 ";
    for (size_t capacity = 1; capacity <= full.size() + 1; ++capacity) {
        SCOPED_TRACE(capacity);
        std::string buffer(capacity + 8, '#');
        char* cursor = buffer.data();
        int32_t counter = 0;
        set.Write(buffer.data(), capacity, cursor, counter);
        const size_t length = size_t(cursor - buffer.data());
        ASSERT_LT(length, capacity);
        EXPECT_EQ(buffer[length], '\0');
        EXPECT_EQ(full.compare(0, length, buffer, 0, length), 0);  // a prefix of whole entries
        for (size_t i = capacity; i < buffer.size(); ++i) ASSERT_EQ(buffer[i], '#');
        EXPECT_EQ(counter, 3);
    }
}

}  // namespace
