// A filter module loaded from disk: the shared library and its entry point.
#pragma once

#include <filesystem>
#include <string>

#include "hostapi/HostInterface.h"

namespace noctiva::host {

class Module {
public:
    // Throws HostError(path, reason) when the file cannot be loaded or lacks the entry symbol.
    explicit Module(const std::filesystem::path& path, const std::string& entryName = "ENTRYPOINT");
    ~Module();
    Module(const Module&) = delete;
    Module& operator=(const Module&) = delete;
    Module(Module&& other) noexcept;
    Module& operator=(Module&& other) noexcept;

    PluginEntryProc entry() const { return entry_; }
    const std::filesystem::path& path() const { return path_; }

private:
    void* library_ = nullptr;
    PluginEntryProc entry_ = nullptr;
    std::filesystem::path path_;
};

}  // namespace noctiva::host
