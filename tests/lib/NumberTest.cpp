#include <gtest/gtest.h>

#include <bit>
#include <cfloat>
#include <climits>
#include <clocale>
#include <cmath>
#include <cstring>
#include <limits>
#include <locale>
#include <random>

#include "lib/text/Number.h"

namespace {

using vek::text::formatNumber;
using vek::text::parseBool;
using vek::text::parseNumber;

template <class T>
using BitsOf = std::conditional_t<sizeof(T) == 4, uint32_t, uint64_t>;

template <class T>
void expectExactRoundTrip(T value) {
    const std::string text = formatNumber(value);
    const auto back = parseNumber<T>(text);
    ASSERT_TRUE(back.has_value()) << text;
    if (std::isnan(value))
        EXPECT_TRUE(std::isnan(*back)) << text;
    else
        EXPECT_EQ(std::bit_cast<BitsOf<T>>(*back), std::bit_cast<BitsOf<T>>(value)) << text;
}

TEST(Number, FloatsAndDoublesReadBackBitForBit) {
    for (float f : {0.0f, -0.0f, 0.1f, 10.0000105f, 1.0f / 3.0f, FLT_MIN, FLT_MAX, FLT_TRUE_MIN, -FLT_MAX,
                    std::numeric_limits<float>::infinity(), -std::numeric_limits<float>::infinity(),
                    std::numeric_limits<float>::quiet_NaN()})
        expectExactRoundTrip(f);
    for (double d : {0.0, -0.0, 0.1 + 0.2, 1.0 / 3.0, DBL_MIN, DBL_MAX, DBL_TRUE_MIN, -1e-300,
                     std::numeric_limits<double>::infinity(), std::numeric_limits<double>::quiet_NaN()})
        expectExactRoundTrip(d);
    EXPECT_EQ(formatNumber(10.0000105f), "10.0000105");            // needs all 9 digits
    EXPECT_EQ(formatNumber(0.1 + 0.2), "0.30000000000000004");      // needs all 17 digits
    EXPECT_EQ(formatNumber(0.1f), "0.1");                           // and no more than needed
}

TEST(Number, RandomBitPatternsRoundTrip) {
    std::mt19937_64 random(12345);
    for (int i = 0; i < 200000; ++i) {
        const uint64_t bits = random();
        expectExactRoundTrip(std::bit_cast<double>(bits));
        const float f = std::bit_cast<float>(static_cast<uint32_t>(bits));
        expectExactRoundTrip(f);
        // Readers that parse a float's text as double and narrow it get the same float.
        if (!std::isnan(f)) {
            const auto viaDouble = parseNumber<double>(formatNumber(f));
            ASSERT_TRUE(viaDouble);
            EXPECT_EQ(static_cast<float>(*viaDouble), f);
        }
    }
}

TEST(Number, IntegersCoverTheirWholeRange) {
    EXPECT_EQ(parseNumber<int32_t>(formatNumber(INT32_MIN)), INT32_MIN);
    EXPECT_EQ(parseNumber<uint32_t>(formatNumber(UINT32_MAX)), UINT32_MAX);
    EXPECT_EQ(parseNumber<int64_t>(formatNumber(INT64_MIN)), INT64_MIN);
    EXPECT_EQ(parseNumber<int32_t>(" +42 \n"), 42);
}

TEST(Number, RejectsWhatIsNotExactlyANumberOfTheType) {
    const char* bad[] = {"", " ", "1x", "x1", "--1", "+-1", "0x10", "1,5", "2147483648", "-2147483649", "1.5"};
    for (const char* text : bad) EXPECT_FALSE(parseNumber<int32_t>(text)) << text;
    EXPECT_FALSE(parseNumber<uint32_t>("-1"));
    EXPECT_FALSE(parseNumber<double>("1e400"));
    EXPECT_FALSE(parseNumber<float>("1e39"));
    EXPECT_FALSE(parseNumber<double>("1,5"));
    EXPECT_THROW(vek::text::parseNumberOrThrow<int32_t>("abc"), vek::text::NumberFormatException);
}

// A process locale with a decimal comma must not leak into the text.
struct CommaDecimal : std::numpunct<char> {
    char do_decimal_point() const override { return ','; }
    char do_thousands_sep() const override { return '.'; }
    std::string do_grouping() const override { return "\3"; }
};

TEST(Number, IgnoresTheProcessLocale) {
    const std::locale previous = std::locale::global(std::locale(std::locale::classic(), new CommaDecimal));
    const std::string cLocale = std::setlocale(LC_ALL, nullptr);
    const bool haveGerman = std::setlocale(LC_ALL, "de_DE.UTF-8") != nullptr;
    EXPECT_EQ(formatNumber(1234.5), "1234.5");
    EXPECT_EQ(formatNumber(1234567), "1234567");
    EXPECT_EQ(parseNumber<double>("1234.5"), 1234.5);
    std::setlocale(LC_ALL, cLocale.c_str());
    std::locale::global(previous);
    if (!haveGerman) GTEST_SKIP() << "C library locale de_DE.UTF-8 not installed; only the C++ locale was varied";
}

TEST(Number, ParsesTruthValues) {
    struct Case {
        const char* text;
        std::optional<bool> expected;
    };
    const Case cases[] = {{"1", true},   {"0", false},     {"TRUE", true},  {"false", false}, {" yes ", true},
                          {"No", false}, {"on", true},     {"off", false},  {"-3", true},     {"", std::nullopt},
                          {"2x", std::nullopt}, {"truee", std::nullopt}};
    for (const Case& c : cases) EXPECT_EQ(parseBool(c.text), c.expected) << c.text;
}

}  // namespace
