#include "lib/text/FastString.h"

#include <ostream>

#include "lib/text/Utf.h"

namespace vek::text {

FastString FastString::fromWide(std::wstring_view wide) { return FastString(wideToUtf8(wide)); }

std::wstring FastString::toWide() const { return utf8ToWide(value_); }

bool FastString::isValidUtf8() const noexcept { return text::isValidUtf8(value_); }

bool FastString::equalsIgnoreAsciiCase(std::string_view other) const noexcept {
    if (other.size() != value_.size()) return false;
    auto lower = [](char c) { return (c >= 'A' && c <= 'Z') ? static_cast<char>(c - 'A' + 'a') : c; };
    for (size_t i = 0; i < other.size(); ++i)
        if (lower(value_[i]) != lower(other[i])) return false;
    return true;
}

std::ostream& operator<<(std::ostream& out, const FastString& s) { return out << s.view(); }

}  // namespace vek::text
