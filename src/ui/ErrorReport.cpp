#include "ui/ErrorReport.h"

#include <fstream>
#include <iostream>
#include <system_error>

#include <wx/config.h>
#include <wx/fileconf.h>
#include <wx/nativewin.h>
#ifdef __WXMSW__
#include <wx/msw/registry.h>
#endif

#include "lib/debug/Log.h"
#include "lib/filesystem/Path.h"
#include "lib/filesystem/SpecialFolders.h"
#include "lib/text/Utf.h"
#include "ui/App.h"
#include "ui/Localization.h"
#include "ui/MessageDialog.h"

namespace fs = std::filesystem;

namespace {

constexpr const char* kVendor = "Corvid";
constexpr const char* kApplication = "Quell 2 Common";
constexpr const char* kFormerApplication = "Quell 2";
constexpr const char* kCreateLayerText = "@Quell2.WarningsErrors.ErrorCreateLayer";
constexpr const char* kTitleKey = "@Quell2.WarningsErrors.TitleWarning";
constexpr const char* kCreateLayerSetting = "ShowErrorCreateLayer";

#ifndef __WXMSW__
wxString fromPath(const fs::path& path) { return wxString::FromUTF8(vek::filesystem::utf8FromPath(path)); }
#endif

fs::path storePath(const char* application) {
    const fs::path base = vek::filesystem::SpecialFolders::userPreferences();
    if (base.empty()) return {};
    return base / kVendor / (std::string(application) + ".conf");
}

// The choices made under the product's earlier store name carry over once, when the shared store
// does not exist yet.
void copyEntries(wxConfigBase& from, wxConfigBase& to) {
    std::vector<wxString> groups{"/"};
    while (!groups.empty()) {
        const wxString group = groups.back();
        groups.pop_back();
        from.SetPath(group);
        wxString name;
        long cookie = 0;
        for (bool more = from.GetFirstEntry(name, cookie); more; more = from.GetNextEntry(name, cookie)) {
            const wxString full = (group == "/" ? group : group + "/") + name;
            switch (from.GetEntryType(name)) {
                case wxConfigBase::Type_Integer: to.Write(full, from.ReadLong(name, 0)); break;
                case wxConfigBase::Type_Float: to.Write(full, from.ReadDouble(name, 0.0)); break;
                case wxConfigBase::Type_Boolean: to.Write(full, from.ReadBool(name, false)); break;
                default: to.Write(full, from.Read(name, wxString())); break;
            }
        }
        for (bool more = from.GetFirstGroup(name, cookie); more; more = from.GetNextGroup(name, cookie))
            groups.push_back((group == "/" ? group : group + "/") + name);
    }
    from.SetPath("/");
}

#ifdef __WXMSW__
// Whether an application's registry-backed store was ever written (HKCU\Software\<vendor>\<application>).
bool storeExists(const char* application) {
    return wxRegKey(wxRegKey::HKCU, wxString("Software\\") + kVendor + "\\" + application).Exists();
}
#endif

std::unique_ptr<wxConfigBase> makeStore() {
#ifdef __WXMSW__
    const bool fresh = !storeExists(kApplication);
    auto store = std::make_unique<wxConfig>(kApplication, kVendor);
    if (fresh && storeExists(kFormerApplication)) {
        wxConfig previous(kFormerApplication, kVendor);
        copyEntries(previous, *store);
    }
    return store;
#else
    const fs::path file = storePath(kApplication);
    if (file.empty()) return std::make_unique<wxFileConfig>(kApplication, kVendor);
    std::error_code ec;
    fs::create_directories(file.parent_path(), ec);
    const bool fresh = !fs::exists(file, ec);
    auto store = std::make_unique<wxFileConfig>(kApplication, kVendor, fromPath(file), wxEmptyString,
                                                wxCONFIG_USE_LOCAL_FILE);
    const fs::path former = storePath(kFormerApplication);
    if (fresh && fs::is_regular_file(former, ec)) {
        wxFileConfig previous(kFormerApplication, kVendor, fromPath(former), wxEmptyString, wxCONFIG_USE_LOCAL_FILE);
        copyEntries(previous, *store);
    }
    return store;
#endif
}

// A parent made from the host's window, so the dialog stays in front of it. Null when the host
// gave none or it cannot be wrapped; the dialog then has no parent.
wxWindow* hostWindow(const pi::FilterRecord* record) {
    if (record == nullptr || record->platformData == nullptr || record->platformData->hwnd == 0) return nullptr;
#if defined(__WXGTK__)
    auto* window = new wxNativeContainerWindow(static_cast<wxNativeContainerWindowId>(record->platformData->hwnd));
#elif defined(__WXMSW__)
    auto* window = new wxNativeContainerWindow(reinterpret_cast<wxNativeContainerWindowHandle>(record->platformData->hwnd));
#else
    wxWindow* window = nullptr;
#endif
    if (window != nullptr && window->GetHandle() == nullptr) {
        window->Destroy();
        window = nullptr;
    }
    return window;
}

// The remembered choice read without the toolkit (which cannot be used before it is started): the
// store's root entries are "name=value" lines before the first "[group]"; the toolkit writes
// booleans as 0 and 1. True, the default, when there is no such entry.
bool storedChoice(const std::string& key) {
#ifdef __WXMSW__
    wxConfig store(kApplication, kVendor);
    return store.ReadBool(wxString::FromUTF8(key.c_str()), true);
#else
    std::ifstream in(storePath(kApplication));
    for (std::string line; std::getline(in, line);) {
        const size_t first = line.find_first_not_of(" \t");
        if (first == std::string::npos) continue;
        if (line[first] == '[') break;
        const size_t equals = line.find('=', first);
        if (equals == std::string::npos) continue;
        std::string name = line.substr(first, equals - first);
        name.erase(name.find_last_not_of(" \t") + 1);
        if (name != key) continue;
        std::string value = line.substr(equals + 1);
        value.erase(0, value.find_first_not_of(" \t"));
        value.erase(value.find_last_not_of(" \t\r") + 1);
        return !(value == "0" || value == "false" || value == "no" || value == "off");
    }
    return true;
#endif
}

void reportWithoutDisplay() {
    const std::string title = vek::text::wideToUtf8(Translate(kTitleKey));
    const std::string text = vek::text::wideToUtf8(Translate(kCreateLayerText));
    const std::string line = "Noctiva: " + title + ": " + text;
    vek::debug::log(vek::debug::Level::Warning, "ErrorReport", __LINE__, line);
    std::cerr << line << '\n' << std::flush;
}

}  // namespace

DialogSettingsStore::DialogSettingsStore() : store_(makeStore()) { previous_ = wxConfigBase::Set(store_.get()); }

DialogSettingsStore::~DialogSettingsStore() {
    wxConfigBase::Set(previous_);
    if (store_) store_->Flush();
}

fs::path DialogSettingsStore::FilePath() { return storePath(kApplication); }

int ShowWarning(wxWindow* parent, const wxString& message, const std::string& settingKey) {
    wxConfigBase* settings = wxConfigBase::Get(false);
    const wxString key = wxString::FromUTF8(settingKey.c_str());
    if (!settingKey.empty() && settings != nullptr && !settings->ReadBool(key, true)) return 0;

    int result = 0;
    {
        MessageDialog dialog(parent, wxString(Translate(kTitleKey)), message, settingKey.empty() ? 0 : 1);
        result = dialog.ShowModal();
    }
    if (result == kNotAgainResult && !settingKey.empty() && settings != nullptr) {
        settings->Write(key, false);
        settings->Flush();
    }
    return result;
}

void ReportCreateLayerError(pi::FilterRecord* filterRecord) {
    try {
        const fs::path base = ModuleFolder();
        if (!StartToolkit()) {
            // A person who turned the warning off does not want it in the log either.
            if (!storedChoice(kCreateLayerSetting)) return;
            LoadLocalization(base);
            reportWithoutDisplay();
            ReleaseLocalization();
            return;
        }
        DialogSettingsStore settings;
        LoadLocalization(base);
        wxWindow* parent = hostWindow(filterRecord);
        ShowWarning(parent, wxString(Translate(kCreateLayerText)), kCreateLayerSetting);
        // The host's window is not ours: the wrapper leaves it alone when it goes.
        if (parent != nullptr) parent->Destroy();
        if (wxTheApp != nullptr) {
            // Deletes the wrapper, and lets the display see the dialog go before the filter gets back to work.
            wxTheApp->ProcessPendingEvents();
            wxTheApp->Yield(true);
        }
        ReleaseLocalization();
    } catch (const std::exception& e) {
        ReleaseLocalization();
        std::cerr << "Noctiva: the create-layer report failed: " << e.what() << '\n';
    }
}
