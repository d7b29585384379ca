#include "config/SettingsConfigFile.h"

#include <filesystem>
#include <system_error>

#include "lib/debug/Log.h"
#include "lib/filesystem/Path.h"
#include "lib/filesystem/SpecialFolders.h"

namespace vek {
namespace {

namespace fs = std::filesystem;

constexpr std::string_view kSource = "SettingsConfigFile";

// Empty when the platform names no preferences folder.
fs::path settingsFolder() {
    const fs::path base = filesystem::SpecialFolders::userPreferences();
    if (base.empty()) return {};
    return (base / "Corvid" / "Quell 2").lexically_normal();
}

fs::path settingsFile(const fs::path& folder) { return (folder / "Quell2.cfg").lexically_normal(); }

}  // namespace

SettingsConfigFile::SettingsConfigFile() {
    const fs::path folder = settingsFolder();
    if (folder.empty()) {
        debug::log(debug::Level::Warning, kSource, __LINE__, "No preferences folder; the settings are not kept.");
        return;
    }
    std::error_code ec;
    if (!fs::exists(folder, ec)) fs::create_directories(folder, ec);
    const fs::path file = settingsFile(folder);
    const text::FastString fileName(filesystem::utf8FromPath(file));
    if (fs::exists(file, ec))
        loadFromFile(fileName);
    else
        writeToFile(fileName, true);
}

SettingsConfigFile::~SettingsConfigFile() {
    if (!getConfigurationFileName().empty()) {
        writeToFile(getConfigurationFileName(), false);
        return;
    }
    // No file name: either the file could not be created at start (try again now, the folder
    // may be back) or it exists but did not load, and then it is left for the user to recover.
    const fs::path folder = settingsFolder();
    if (folder.empty()) return;
    const fs::path file = settingsFile(folder);
    std::error_code ec;
    if (!fs::exists(file, ec) && !ec) writeToFile(text::FastString(filesystem::utf8FromPath(file)), true);
}

}  // namespace vek
