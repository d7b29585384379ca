// The product's message box: an icon, a text and the buttons of one of seven kinds.
#pragma once

#include <vector>

#include <wx/bitmap.h>
#include <wx/panel.h>

#include "ui/DialogBase.h"

class wxButton;
class wxCheckBox;

// The modal result of a dialog ended while its NotAgain box was ticked.
inline constexpr int kNotAgainResult = 5113;

struct ButtonDefinition {
    const char* labelKey;
    int id;  // returned by the modal loop; -1 for the NotAgain check box
};

// The buttons of a kind, in panel order; none above kind 6.
std::vector<ButtonDefinition> ButtonsForKind(int kind);

class DialogButtonPanel : public wxPanel {
public:
    DialogButtonPanel(wxWindow* parent, const std::vector<ButtonDefinition>& buttons);

    bool NotAgainTicked() const;
    wxCheckBox* NotAgainBox() const noexcept { return notAgain_; }
    wxButton* FirstButton() const noexcept { return first_; }

private:
    wxCheckBox* notAgain_ = nullptr;  // owned by the panel
    wxButton* first_ = nullptr;       // owned by the panel
};

class MessageDialog : public DialogBase {
public:
    MessageDialog(wxWindow* parent, const wxString& title, const wxString& message, int kind);

    int Kind() const noexcept { return kind_; }
    DialogButtonPanel* ButtonPanel() const noexcept { return buttons_; }
    // A ticked NotAgain box turns every way of ending the dialog into kNotAgainResult: whatever
    // was pressed, the person asked not to be asked again.
    void EndModal(int code) override;

protected:
    void PaintDecoration(wxDC& dc, const wxPoint& origin) override;

private:
    int kind_;
    wxBitmap icon_;
    DialogButtonPanel* buttons_ = nullptr;  // owned by the dialog
};

// The product's warning sign, drawn rather than taken from the desktop theme so it looks the same
// everywhere (and exists where no icon theme is installed).
wxBitmap WarningIcon();
