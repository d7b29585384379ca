#include "noctiva/host/Module.h"

#ifdef _WIN32
#include <windows.h>
#else
#include <dlfcn.h>
#endif

#include <utility>

#include "noctiva/host/Error.h"

namespace noctiva::host {

namespace {
#ifdef _WIN32
std::string lastDlError(const char*) { return "error " + std::to_string(GetLastError()); }
void* dlopen(const std::filesystem::path& path) { return LoadLibraryW(path.c_str()); }
void* dlsym(void* library, const char* name) {
    return reinterpret_cast<void*>(GetProcAddress(static_cast<HMODULE>(library), name));
}
void dlclose(void* library) { FreeLibrary(static_cast<HMODULE>(library)); }
#else
std::string lastDlError(const char* fallback) {
    const char* e = dlerror();
    return e ? e : fallback;
}
void* dlopen(const std::filesystem::path& path) { return ::dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL); }
#endif
}  // namespace

Module::Module(const std::filesystem::path& path, const std::string& entryName) : path_(path) {
#ifndef _WIN32
    dlerror();
#endif
    library_ = dlopen(path);
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
