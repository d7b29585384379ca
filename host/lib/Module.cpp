#include "noctiva/host/Module.h"

#include <dlfcn.h>

#include <utility>

#include "noctiva/host/Error.h"

namespace noctiva::host {

namespace {
std::string lastDlError(const char* fallback) {
    const char* e = dlerror();
    return e ? e : fallback;
}
}  // namespace

Module::Module(const std::filesystem::path& path, const std::string& entryName) : path_(path) {
    dlerror();
    library_ = dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (!library_) throw HostError(path.string(), "cannot load module: " + lastDlError("unknown error"));
    void* symbol = dlsym(library_, entryName.c_str());
    if (!symbol) {
        const std::string reason = "module has no entry point " + entryName + ": " + lastDlError("symbol missing");
        dlclose(library_);
        library_ = nullptr;
        throw HostError(path.string(), reason);
    }
    entry_ = reinterpret_cast<PluginEntryProc>(symbol);
}

Module Module::load(const std::filesystem::path& path) {
    ModuleInfo info = readModuleInfo(path);
    Module module(path, info.entryPoint);
    module.info_ = std::move(info);
    return module;
}

Module::~Module() {
    if (library_) dlclose(library_);
}

Module::Module(Module&& other) noexcept
    : library_(std::exchange(other.library_, nullptr)),
      entry_(std::exchange(other.entry_, nullptr)),
      path_(std::move(other.path_)),
      info_(std::exchange(other.info_, std::nullopt)) {}

Module& Module::operator=(Module&& other) noexcept {
    if (this != &other) {
        if (library_) dlclose(library_);
        library_ = std::exchange(other.library_, nullptr);
        entry_ = std::exchange(other.entry_, nullptr);
        path_ = std::move(other.path_);
        info_ = std::exchange(other.info_, std::nullopt);
    }
    return *this;
}

}  // namespace noctiva::host
