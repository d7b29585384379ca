#include "ui/MessageDialog.h"

#include <wx/brush.h>
#include <wx/button.h>
#include <wx/checkbox.h>
#include <wx/dcmemory.h>
#include <wx/pen.h>
#include <wx/sizer.h>
#include <wx/statbmp.h>
#include <wx/stattext.h>

#include "ui/Localization.h"

namespace {

constexpr ButtonDefinition kOK{"@CommonCtrl.DialogButtons.OK.Label", wxID_OK};
constexpr ButtonDefinition kOKAsYes{"@CommonCtrl.DialogButtons.OK.Label", wxID_YES};
constexpr ButtonDefinition kCancel{"@CommonCtrl.DialogButtons.Cancel.Label", wxID_CANCEL};
constexpr ButtonDefinition kYes{"@CommonCtrl.DialogButtons.Yes.Label", wxID_YES};
constexpr ButtonDefinition kNo{"@CommonCtrl.DialogButtons.No.Label", wxID_NO};
constexpr ButtonDefinition kNotAgain{"@CommonCtrl.DialogButtons.NotAgain.Label", -1};

// Where the painted icon sits, from the top-left corner of the dialog's face.
constexpr int kIconLeft = 18;
constexpr int kIconTop = 20;
constexpr int kIconSize = 32;

wxString label(const char* key) { return wxString(Translate(key)); }

}  // namespace

std::vector<ButtonDefinition> ButtonsForKind(int kind) {
    switch (kind) {
        case 0: return {kOK};
        case 1: return {kOK, kNotAgain};
        case 2: return {kOK, kCancel};
        case 3: return {kOK, kCancel, kNotAgain};
        case 4: return {kNo, kYes};
        case 5: return {kNo, kYes, kNotAgain};
        case 6: return {kOKAsYes, kCancel};
        default: return {};
    }
}

wxBitmap WarningIcon() {
    wxBitmap bitmap(kIconSize, kIconSize, 24);
    wxMemoryDC dc(bitmap);
    dc.SetBackground(wxBrush(DialogBase::BackgroundColour()));
    dc.Clear();
    const wxPoint triangle[] = {{kIconSize / 2, 1}, {kIconSize - 2, kIconSize - 3}, {1, kIconSize - 3}};
    dc.SetPen(wxPen(DialogBase::FrameColour(), 1));
    dc.SetBrush(wxBrush(wxColour(245, 190, 30)));
    dc.DrawPolygon(3, triangle);
    dc.SetPen(*wxTRANSPARENT_PEN);
    dc.SetBrush(wxBrush(DialogBase::FrameColour()));
    dc.DrawRectangle(kIconSize / 2 - 2, 10, 4, 11);
    dc.DrawRectangle(kIconSize / 2 - 2, 23, 4, 4);
    dc.SelectObject(wxNullBitmap);
    return bitmap;
}

DialogButtonPanel::DialogButtonPanel(wxWindow* parent, const std::vector<ButtonDefinition>& buttons)
    : wxPanel(parent, wxID_ANY) {
    SetBackgroundColour(DialogBase::BackgroundColour());
    auto* row = new wxBoxSizer(wxHORIZONTAL);
    auto* pushButtons = new wxBoxSizer(wxHORIZONTAL);
    // Children are made in panel order (that is the keyboard order); the box goes to the left.
    for (const ButtonDefinition& definition : buttons) {
        if (definition.id == -1) {
            notAgain_ = new wxCheckBox(this, wxID_ANY, label(definition.labelKey));
            continue;
        }
        auto* button = new wxButton(this, definition.id, label(definition.labelKey));
        if (first_ == nullptr) first_ = button;
        pushButtons->Add(button, 0, wxLEFT, 8);
    }
    if (notAgain_ != nullptr) row->Add(notAgain_, 0, wxALIGN_CENTER_VERTICAL | wxRIGHT, 16);
    row->AddStretchSpacer();
    row->Add(pushButtons, 0, wxALIGN_CENTER_VERTICAL);
    SetSizer(row);
}

bool DialogButtonPanel::NotAgainTicked() const { return notAgain_ != nullptr && notAgain_->IsChecked(); }

MessageDialog::MessageDialog(wxWindow* parent, const wxString& title, const wxString& message, int kind)
    : DialogBase(parent, title), kind_(kind), icon_(WarningIcon()) {
    auto* text = new wxStaticText(this, wxID_ANY, message, wxDefaultPosition, wxDefaultSize, 0, "staticText");
    text->SetBackgroundColour(BackgroundColour());
    text->Wrap(FromDIP(420));

    const std::vector<ButtonDefinition> definitions = ButtonsForKind(kind);
    buttons_ = new DialogButtonPanel(this, definitions);
    for (const ButtonDefinition& definition : definitions) {
        if (definition.id == -1) continue;
        const int id = definition.id;
        Bind(wxEVT_BUTTON, [this, id](wxCommandEvent&) { EndModal(id); }, id);
    }

    auto* column = new wxBoxSizer(wxVERTICAL);
    if (kind == 6) {
        // This kind shows its icon as a control centred above the text instead of painting it.
        column->Add(new wxStaticBitmap(this, wxID_ANY, icon_), 0, wxALIGN_CENTER_HORIZONTAL | wxTOP, kIconTop);
        column->Add(text, 0, wxALIGN_CENTER_HORIZONTAL | wxALL, 16);
    } else {
        auto* top = new wxBoxSizer(wxHORIZONTAL);
        // Room for the icon painted on the face.
        top->Add(kIconLeft + kIconSize, kIconTop + kIconSize);
        top->Add(text, 1, wxLEFT | wxRIGHT | wxTOP, 16);
        column->Add(top, 1, wxEXPAND);
    }
    column->Add(buttons_, 0, wxEXPAND | wxALL, 12);
    SetSizerAndFit(column);
    CentreOnParent();

    if (wxButton* first = buttons_->FirstButton()) {
        first->SetDefault();
        SetAffirmativeId(first->GetId());
        first->SetFocus();
    }
}

void MessageDialog::EndModal(int code) {
    if (buttons_ != nullptr && buttons_->NotAgainTicked()) code = kNotAgainResult;
    DialogBase::EndModal(code);
}

void MessageDialog::PaintDecoration(wxDC& dc, const wxPoint& origin) {
    if (kind_ == 6 || !icon_.IsOk()) return;
    dc.DrawBitmap(icon_, origin.x + kIconLeft, origin.y + kIconTop, false);
}
