#include "noctiva/host/ParentWindow.h"

#ifndef _WIN32
#include <dlfcn.h>
#endif

#include <cstdlib>
#include <utility>

namespace noctiva::host {

#ifdef _WIN32
// Not yet on Windows: the module gets no parent window (hwnd 0).
ParentWindow ParentWindow::open() { return ParentWindow(); }
void ParentWindow::close() noexcept {}
#else
namespace {

// The few Xlib calls we need, resolved once. The library stays loaded for the life of the
// process: a module's toolkit may hold on to the same library.
struct Xlib {
    using Display = void;
    using Window = unsigned long;
    Display* (*openDisplay)(const char*) = nullptr;
    int (*closeDisplay)(Display*) = nullptr;
    int (*defaultScreen)(Display*) = nullptr;
    Window (*rootWindow)(Display*, int) = nullptr;
    unsigned long (*blackPixel)(Display*, int) = nullptr;
    Window (*createSimpleWindow)(Display*, Window, int, int, unsigned, unsigned, unsigned, unsigned long,
                                 unsigned long) = nullptr;
    int (*storeName)(Display*, Window, const char*) = nullptr;
    int (*mapWindow)(Display*, Window) = nullptr;
    int (*destroyWindow)(Display*, Window) = nullptr;
    int (*sync)(Display*, int) = nullptr;
    bool ok = false;

    Xlib() {
        void* lib = dlopen("libX11.so.6", RTLD_NOW | RTLD_LOCAL);
        if (!lib) return;
        ok = bind(lib, openDisplay, "XOpenDisplay") && bind(lib, closeDisplay, "XCloseDisplay") &&
             bind(lib, defaultScreen, "XDefaultScreen") && bind(lib, rootWindow, "XRootWindow") &&
             bind(lib, blackPixel, "XBlackPixel") && bind(lib, createSimpleWindow, "XCreateSimpleWindow") &&
             bind(lib, storeName, "XStoreName") && bind(lib, mapWindow, "XMapWindow") &&
             bind(lib, destroyWindow, "XDestroyWindow") && bind(lib, sync, "XSync");
    }
    template <typename F>
    static bool bind(void* lib, F& f, const char* name) {
        f = reinterpret_cast<F>(dlsym(lib, name));
        return f != nullptr;
    }
};

const Xlib& xlib() {
    static const Xlib x;
    return x;
}

}  // namespace

ParentWindow ParentWindow::open() {
    ParentWindow w;
    const char* name = std::getenv("DISPLAY");
    if (!name || !*name) return w;
    const Xlib& x = xlib();
    if (!x.ok) return w;
    w.display_ = x.openDisplay(name);
    if (!w.display_) return w;
    const int screen = x.defaultScreen(w.display_);
    const unsigned long black = x.blackPixel(w.display_, screen);
    w.window_ = x.createSimpleWindow(w.display_, x.rootWindow(w.display_, screen), 0, 0, 320, 200, 0, black, black);
    if (w.window_ != 0) {
        x.storeName(w.display_, w.window_, "noctiva host");
        x.mapWindow(w.display_, w.window_);
    }
    // The module may use the id from another connection at once: it must exist on the server.
    x.sync(w.display_, 0);
    return w;
}

void ParentWindow::close() noexcept {
    if (!display_) return;
    const Xlib& x = xlib();
    if (window_) x.destroyWindow(display_, window_);
    x.closeDisplay(display_);  // flushes the destruction
    display_ = nullptr;
    window_ = 0;
}
#endif

ParentWindow::~ParentWindow() { close(); }

ParentWindow::ParentWindow(ParentWindow&& other) noexcept
    : display_(std::exchange(other.display_, nullptr)), window_(std::exchange(other.window_, 0)) {}

ParentWindow& ParentWindow::operator=(ParentWindow&& other) noexcept {
    if (this != &other) {
        close();
        display_ = std::exchange(other.display_, nullptr);
        window_ = std::exchange(other.window_, 0);
    }
    return *this;
}

}  // namespace noctiva::host
