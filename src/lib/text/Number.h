// Number and truth-value text in the C locale, whatever the process locale is. Formatting
// writes the shortest text that parses back to exactly the same value.
#pragma once

#include <charconv>
#include <optional>
#include <string>
#include <string_view>
#include <type_traits>

#include "lib/Exception.h"

namespace vek::text {

class NumberFormatException : public CloneableException<NumberFormatException> {
public:
    using CloneableException::CloneableException;
};

template <class T>
concept Number = std::is_arithmetic_v<T> && !std::is_same_v<T, bool>;

std::string formatNumber(float value);
std::string formatNumber(double value);

template <std::integral T>
    requires Number<T>
std::string formatNumber(T value) {
    char buffer[24];
    const auto end = std::to_chars(buffer, buffer + sizeof buffer, value).ptr;
    return std::string(buffer, end);
}

namespace detail {
// Strips ASCII blanks and one leading '+'; nullopt if what remains could not be a number.
std::optional<std::string_view> numberBody(std::string_view text) noexcept;
}  // namespace detail

// The whole text must be the number (surrounding blanks allowed); nullopt when it is not, or
// when the value does not fit T.
template <Number T>
std::optional<T> parseNumber(std::string_view text) noexcept {
    const auto body = detail::numberBody(text);
    if (!body) return std::nullopt;
    T value{};
    const char* first = body->data();
    const char* last = first + body->size();
    std::from_chars_result r;
    if constexpr (std::is_floating_point_v<T>)
        r = std::from_chars(first, last, value, std::chars_format::general);
    else
        r = std::from_chars(first, last, value, 10);
    if (r.ec != std::errc{} || r.ptr != last) return std::nullopt;
    return value;
}

// As parseNumber, but throws NumberFormatException naming the text.
template <Number T>
T parseNumberOrThrow(std::string_view text) {
    if (auto v = parseNumber<T>(text)) return *v;
    throw NumberFormatException("not a number of the expected type: '" + std::string(text) + "'");
}

// "1"/"0", "true"/"false", "yes"/"no", "on"/"off" (any letter case, blanks around allowed), and
// any other integer (non-zero is true). nullopt for anything else.
std::optional<bool> parseBool(std::string_view text) noexcept;

}  // namespace vek::text
