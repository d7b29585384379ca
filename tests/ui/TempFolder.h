// A fresh folder under the system's temporary folder, removed with everything in it at the end.
#pragma once

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>
#include <string_view>

class TempFolder {
public:
    TempFolder() {
        std::string pattern = (std::filesystem::temp_directory_path() / "noctiva-ui-XXXXXX").string();
        if (mkdtemp(pattern.data()) != nullptr) path_ = pattern;
    }
    ~TempFolder() {
        std::error_code ec;
        if (!path_.empty()) std::filesystem::remove_all(path_, ec);
    }
    TempFolder(const TempFolder&) = delete;
    TempFolder& operator=(const TempFolder&) = delete;

    const std::filesystem::path& path() const noexcept { return path_; }

    void write(const std::filesystem::path& relative, std::string_view content) const {
        const auto file = path_ / relative;
        std::filesystem::create_directories(file.parent_path());
        std::ofstream(file, std::ios::binary) << content;
    }

private:
    std::filesystem::path path_;
};

// Points the per-user folders at `folder` for the lifetime of the object.
class ScopedUserFolders {
public:
    explicit ScopedUserFolders(const std::filesystem::path& folder) {
        save("XDG_CONFIG_HOME", xdg_, hadXdg_);
        save("HOME", home_, hadHome_);
        setenv("XDG_CONFIG_HOME", (folder / "config").c_str(), 1);
        setenv("HOME", folder.c_str(), 1);
    }
    ~ScopedUserFolders() {
        restore("XDG_CONFIG_HOME", xdg_, hadXdg_);
        restore("HOME", home_, hadHome_);
    }
    ScopedUserFolders(const ScopedUserFolders&) = delete;
    ScopedUserFolders& operator=(const ScopedUserFolders&) = delete;

private:
    static void save(const char* name, std::string& value, bool& had) {
        const char* v = std::getenv(name);
        had = v != nullptr;
        if (had) value = v;
    }
    static void restore(const char* name, const std::string& value, bool had) {
        if (had)
            setenv(name, value.c_str(), 1);
        else
            unsetenv(name);
    }
    std::string xdg_, home_;
    bool hadXdg_ = false, hadHome_ = false;
};
