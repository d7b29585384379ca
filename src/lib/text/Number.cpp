#include "lib/text/Number.h"

#include <array>

namespace vek::text {
namespace {

bool isBlank(char c) { return c == ' ' || c == '\t' || c == '\n' || c == '\r'; }

std::string_view trim(std::string_view s) {
    while (!s.empty() && isBlank(s.front())) s.remove_prefix(1);
    while (!s.empty() && isBlank(s.back())) s.remove_suffix(1);
    return s;
}

template <class T>
std::string shortest(T value) {
    char buffer[64];
    const auto end = std::to_chars(buffer, buffer + sizeof buffer, value).ptr;
    return std::string(buffer, end);
}

}  // namespace

namespace detail {
std::optional<std::string_view> numberBody(std::string_view text) noexcept {
    text = trim(text);
    if (!text.empty() && text.front() == '+') {
        text.remove_prefix(1);
        if (!text.empty() && text.front() == '-') return std::nullopt;
    }
    if (text.empty()) return std::nullopt;
    return text;
}
}  // namespace detail

std::string formatNumber(double value) { return shortest(value); }

std::string formatNumber(float value) {
    // The shortest float text; older readers parse it as a double and narrow, which can round
    // twice. Where that would land on another float, write the exact double instead.
    std::string text = shortest(value);
    const auto asDouble = parseNumber<double>(text);
    if (asDouble && static_cast<float>(*asDouble) == value) return text;
    if (value != value) return text;  // NaN never compares equal; its text is fine
    return shortest(static_cast<double>(value));
}

std::optional<bool> parseBool(std::string_view text) noexcept {
    text = trim(text);
    static constexpr std::array<std::pair<std::string_view, bool>, 6> words{{
        {"true", true}, {"false", false}, {"yes", true}, {"no", false}, {"on", true}, {"off", false}}};
    for (const auto& [word, result] : words) {
        if (word.size() != text.size()) continue;
        bool same = true;
        for (size_t i = 0; i < word.size() && same; ++i) {
            char c = text[i];
            if (c >= 'A' && c <= 'Z') c = static_cast<char>(c - 'A' + 'a');
            same = c == word[i];
        }
        if (same) return result;
    }
    if (const auto n = parseNumber<long long>(text)) return *n != 0;
    return std::nullopt;
}

}  // namespace vek::text
