// UTF-8 text to and from file-system paths, the same on every platform.
#pragma once

#include <filesystem>
#include <string>
#include <string_view>

namespace vek::filesystem {

inline std::filesystem::path pathFromUtf8(std::string_view utf8) {
    return std::filesystem::path(std::u8string(utf8.begin(), utf8.end()));
}

inline std::string utf8FromPath(const std::filesystem::path& path) {
    const std::u8string s = path.u8string();
    return std::string(s.begin(), s.end());
}

}  // namespace vek::filesystem
