#include "ui/App.h"

#ifdef _WIN32
#include <windows.h>
#else
#include <dlfcn.h>
#endif

#include <clocale>
#include <cstdlib>
#include <iostream>
#include <string>

#include <wx/init.h>
#include <wx/string.h>

wxIMPLEMENT_APP_NO_MAIN(HiddenFilterApp);

bool HiddenFilterApp::OnInit() {
    SetAppName("Quell2");
    SetVendorName("Vek Software");
    return true;
}

namespace {

enum class Toolkit { NotStarted, Running, Unavailable };
Toolkit gToolkit = Toolkit::NotStarted;

#ifdef _WIN32
// A service's invisible window station, or a session where no window can be made (Wine without
// an X server), has no one to click the dialog: it would wait for ever.
bool displayAvailable() {
    USEROBJECTFLAGS flags{};
    HWINSTA station = GetProcessWindowStation();
    if (station != nullptr &&
        GetUserObjectInformationW(station, UOI_FLAGS, &flags, sizeof flags, nullptr) &&
        (flags.dwFlags & WSF_VISIBLE) == 0)
        return false;
    HWND probe = CreateWindowExW(0, L"STATIC", L"", WS_POPUP, 0, 0, 1, 1, nullptr, nullptr, nullptr, nullptr);
    if (probe == nullptr) return false;
    DestroyWindow(probe);
    return true;
}

HMODULE thisModule(DWORD extraFlags) {
    HMODULE module = nullptr;
    if (!GetModuleHandleExW(GET_MODULE_HANDLE_EX_FLAG_FROM_ADDRESS | extraFlags,
                            reinterpret_cast<LPCWSTR>(&thisModule), &module))
        return nullptr;
    return module;
}

// The toolkit's window classes point into this module, and nothing unregisters them: a host that
// unloads the module would leave them pointing at freed code.
void pinModule() { thisModule(GET_MODULE_HANDLE_EX_FLAG_PIN); }
#else
bool displayAvailable() {
    for (const char* variable : {"DISPLAY", "WAYLAND_DISPLAY"}) {
        const char* value = std::getenv(variable);
        if (value != nullptr && *value != '\0') return true;
    }
    return false;
}

// Once GTK is initialised, its libraries (and the toolkit's, which registered types with it) must
// never be unmapped: pin this module, and through it them, for the life of the process.
void pinModule() {
    Dl_info info{};
    if (dladdr(reinterpret_cast<const void*>(&pinModule), &info) == 0 || info.dli_fname == nullptr) return;
    if (void* self = dlopen(info.dli_fname, RTLD_NOW | RTLD_NOLOAD | RTLD_NODELETE)) dlclose(self);
}
#endif

// A failed toolkit check inside a host must not pop up assertion dialogs.
void logAssertion(const wxString& file, int line, const wxString& func, const wxString& cond, const wxString& msg) {
    std::cerr << "Noctiva: toolkit assertion " << cond.utf8_string() << " (" << msg.utf8_string() << ") at "
              << file.utf8_string() << ':' << line << '\n';
}

}  // namespace

bool StartToolkit() {
    if (gToolkit == Toolkit::Running) return true;
    if (gToolkit == Toolkit::Unavailable) return false;
    if (wxTheApp != nullptr) {  // the host is itself a toolkit program
        gToolkit = Toolkit::Running;
        return true;
    }
    if (!displayAvailable()) {
        gToolkit = Toolkit::Unavailable;
        return false;
    }
    wxSetAssertHandler(&logAssertion);
    // GTK sets the process locale from the environment; the host's own setting must survive.
    const char* current = std::setlocale(LC_ALL, nullptr);
    const std::string hostLocale = current != nullptr ? current : "C";

#ifdef _WIN32
    // The toolkit registers its window classes for the instance it is given: this module, not the host.
    bool started = wxEntryStart(thisModule(GET_MODULE_HANDLE_EX_FLAG_UNCHANGED_REFCOUNT));
#else
    static char programName[] = "Noctiva";
    static char* arguments[] = {programName, nullptr};
    int count = 1;
    bool started = wxEntryStart(count, arguments);
#endif
    if (started && (wxTheApp == nullptr || !wxTheApp->CallOnInit())) {
        wxEntryCleanup();
        started = false;
    }
    std::setlocale(LC_ALL, hostLocale.c_str());
    if (!started) {
        gToolkit = Toolkit::Unavailable;
        return false;
    }
    pinModule();
    gToolkit = Toolkit::Running;
    return true;
}
