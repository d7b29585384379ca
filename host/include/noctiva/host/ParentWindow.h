// A window of the host's own, handed to the module as the parent of its dialogs
// (platformData->hwnd). On X11 it is a small toplevel named "noctiva host" on the display
// $DISPLAY names. libX11 is loaded at run time, so the host runs where X is not installed;
// without a display (or without libX11) there is no window and the id is 0.
#pragma once

#include <cstdint>

namespace noctiva::host {

class ParentWindow {
public:
    ParentWindow() = default;  // no window
    // Opens the display and creates the window; an empty ParentWindow when that is impossible.
    static ParentWindow open();
    ~ParentWindow();
    ParentWindow(ParentWindow&& other) noexcept;
    ParentWindow& operator=(ParentWindow&& other) noexcept;
    ParentWindow(const ParentWindow&) = delete;
    ParentWindow& operator=(const ParentWindow&) = delete;

    // The X window id, or 0.
    std::intptr_t id() const { return std::intptr_t(window_); }
    explicit operator bool() const { return window_ != 0; }

private:
    void close() noexcept;

    void* display_ = nullptr;    // Display*, owned
    unsigned long window_ = 0;  // Window (an XID)
};

}  // namespace noctiva::host
