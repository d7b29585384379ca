#include "ui/App.h"

#include <dlfcn.h>

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

bool displayNamed() {
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
    if (!displayNamed()) {
        gToolkit = Toolkit::Unavailable;
        return false;
    }
    wxSetAssertHandler(&logAssertion);
    // GTK sets the process locale from the environment; the host's own setting must survive.
    const char* current = std::setlocale(LC_ALL, nullptr);
    const std::string hostLocale = current != nullptr ? current : "C";

    static char programName[] = "Noctiva";
    static char* arguments[] = {programName, nullptr};
    int count = 1;
    bool started = wxEntryStart(count, arguments);
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
