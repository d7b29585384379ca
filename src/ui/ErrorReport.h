// Warnings shown to the user, each of which can be turned off for good with the NotAgain box,
// and the one report this filter makes: the host could not create the layer it needs.
#pragma once

#include <filesystem>
#include <memory>
#include <string>

#include "hostapi/HostInterface.h"

class wxConfigBase;
class wxString;
class wxWindow;

// The remembered choices of the product's dialogs (vendor "Corvid", application "Quell 2 Common"),
// installed as the toolkit's global configuration for its lifetime and written back when it ends.
class DialogSettingsStore {
public:
    DialogSettingsStore();
    ~DialogSettingsStore();
    DialogSettingsStore(const DialogSettingsStore&) = delete;
    DialogSettingsStore& operator=(const DialogSettingsStore&) = delete;

    wxConfigBase* Get() const noexcept { return store_.get(); }

    // Where the store lives on platforms without a registry.
    static std::filesystem::path FilePath();

private:
    std::unique_ptr<wxConfigBase> store_;
    wxConfigBase* previous_ = nullptr;  // not owned: whatever was installed before
};

// Shows `message` unless the setting `settingKey` says not to; a non-empty key offers the NotAgain
// box and remembers a tick. Returns the dialog's result, or 0 when nothing was shown.
int ShowWarning(wxWindow* parent, const wxString& message, const std::string& settingKey);

// The whole create-layer report: settings, catalogue, a parent over the host's window, the warning,
// and everything released again. Without a display the text goes to standard error.
void ReportCreateLayerError(pi::FilterRecord* filterRecord);
