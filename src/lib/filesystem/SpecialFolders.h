// Per-user folders the platform designates.
#pragma once

#include <filesystem>

namespace vek::filesystem {

class SpecialFolders {
public:
    // Where per-user settings belong: the roaming application-data folder on Windows,
    // $XDG_CONFIG_HOME (when absolute) or ~/.config elsewhere. Empty when it cannot be found.
    static std::filesystem::path userPreferences();
};

}  // namespace vek::filesystem
