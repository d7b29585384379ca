// A filter module loaded from disk: the shared library and its entry point.
#pragma once

#include <filesystem>
#include <optional>
#include <string>

#include "hostapi/HostInterface.h"
#include "noctiva/host/ModuleInfo.h"

namespace noctiva::host {

class Module {
public:
    // Throws HostError(path, reason) when the file cannot be loaded or lacks the entry symbol.
    explicit Module(const std::filesystem::path& path, const std::string& entryName = "ENTRYPOINT");
    // As an image editor loads a plug-in: reads the module's PIPL and AETE first (see
    // readModuleInfo), refuses a file that is not a filter this host can run, then loads it and
    // resolves the entry point the PIPL names. Throws HostError(path, reason).
    static Module load(const std::filesystem::path& path);
    ~Module();
    Module(const Module&) = delete;
    Module& operator=(const Module&) = delete;
    Module(Module&& other) noexcept;
    Module& operator=(Module&& other) noexcept;

    PluginEntryProc entry() const { return entry_; }
    const std::filesystem::path& path() const { return path_; }
    // The module's resources; null for a module opened by entry name without reading them.
    const ModuleInfo* info() const { return info_ ? &*info_ : nullptr; }

private:
    void* library_ = nullptr;
    PluginEntryProc entry_ = nullptr;
    std::filesystem::path path_;
    std::optional<ModuleInfo> info_;
};

}  // namespace noctiva::host
