// A UTF-8 string: a thin wrapper over std::string that says what its bytes mean and converts
// to and from the platform's wide strings. Comparison is plain byte order (as std::string).
#pragma once

#include <compare>
#include <cstddef>
#include <functional>
#include <iosfwd>
#include <string>
#include <string_view>
#include <utility>

namespace vek::text {

class FastString {
public:
    static constexpr size_t npos = std::string::npos;

    FastString() = default;
    FastString(const char* utf8) : value_(utf8 ? utf8 : "") {}
    FastString(std::string utf8) noexcept : value_(std::move(utf8)) {}
    FastString(std::string_view utf8) : value_(utf8) {}
    FastString(const char* utf8, size_t size) : value_(utf8, size) {}

    static FastString fromWide(std::wstring_view wide);
    std::wstring toWide() const;

    const std::string& str() const noexcept { return value_; }
    std::string_view view() const noexcept { return value_; }
    const char* c_str() const noexcept { return value_.c_str(); }
    operator std::string_view() const noexcept { return value_; }

    size_t size() const noexcept { return value_.size(); }
    bool empty() const noexcept { return value_.empty(); }
    void clear() noexcept { value_.clear(); }
    bool isValidUtf8() const noexcept;

    size_t find(std::string_view needle, size_t from = 0) const noexcept { return value_.find(needle, from); }
    bool contains(std::string_view needle) const noexcept { return value_.find(needle) != npos; }
    bool startsWith(std::string_view prefix) const noexcept { return view().starts_with(prefix); }
    bool endsWith(std::string_view suffix) const noexcept { return view().ends_with(suffix); }
    // ASCII letters only; other bytes must match exactly.
    bool equalsIgnoreAsciiCase(std::string_view other) const noexcept;

    FastString& operator+=(std::string_view tail) {
        value_.append(tail);
        return *this;
    }
    FastString& operator+=(char c) {
        value_.push_back(c);
        return *this;
    }
    friend FastString operator+(FastString lhs, std::string_view rhs) { return lhs += rhs; }

    friend bool operator==(const FastString& a, const FastString& b) noexcept { return a.value_ == b.value_; }
    friend std::strong_ordering operator<=>(const FastString& a, const FastString& b) noexcept {
        return a.value_ <=> b.value_;
    }

private:
    std::string value_;
};

std::ostream& operator<<(std::ostream& out, const FastString& s);

}  // namespace vek::text

namespace vek {
// The name the configuration's messages use for its string type.
using utf8string = text::FastString;
}  // namespace vek

template <>
struct std::hash<vek::text::FastString> {
    size_t operator()(const vek::text::FastString& s) const noexcept { return std::hash<std::string_view>{}(s.view()); }
};
