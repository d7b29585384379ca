// Conversions between UTF-8 and the platform's wide strings (UTF-32 where wchar_t has 32 bits,
// UTF-16 on Windows). Malformed input never fails: each bad sequence becomes U+FFFD.
#pragma once

#include <string>
#include <string_view>

namespace vek::text {

bool isValidUtf8(std::string_view text) noexcept;
std::wstring utf8ToWide(std::string_view text);
std::string wideToUtf8(std::wstring_view text);

}  // namespace vek::text
