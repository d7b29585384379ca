#include "lib/filesystem/SpecialFolders.h"

#ifdef _WIN32
#include <shlobj.h>
#include <windows.h>
#else
#include <pwd.h>
#include <unistd.h>

#include <cstdlib>
#include <vector>
#endif

namespace vek::filesystem {

#ifdef _WIN32

std::filesystem::path SpecialFolders::userPreferences() {
    PWSTR folder = nullptr;
    std::filesystem::path result;
    if (SUCCEEDED(SHGetKnownFolderPath(FOLDERID_RoamingAppData, KF_FLAG_CREATE, nullptr, &folder)) && folder)
        result = std::filesystem::path(folder);
    CoTaskMemFree(folder);
    return result;
}

#else

namespace {
std::filesystem::path homeFolder() {
    if (const char* home = std::getenv("HOME"); home && *home) return home;
    std::vector<char> buffer(16384);
    passwd entry{};
    passwd* found = nullptr;
    if (getpwuid_r(getuid(), &entry, buffer.data(), buffer.size(), &found) == 0 && found && found->pw_dir)
        return found->pw_dir;
    return {};
}
}  // namespace

std::filesystem::path SpecialFolders::userPreferences() {
    // A relative XDG_CONFIG_HOME is invalid and must be ignored.
    if (const char* xdg = std::getenv("XDG_CONFIG_HOME"); xdg && *xdg) {
        std::filesystem::path p(xdg);
        if (p.is_absolute()) return p;
    }
    const auto home = homeFolder();
    return home.empty() ? home : home / ".config";
}

#endif

}  // namespace vek::filesystem
