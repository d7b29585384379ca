// The look every dialog of the product shares: a light grey face framed by dark one-pixel lines.
#pragma once

#include <wx/colour.h>
#include <wx/dialog.h>

class wxDC;

class DialogBase : public wxDialog {
public:
    static wxColour BackgroundColour() { return wxColour(233, 233, 233); }
    static wxColour FrameColour() { return wxColour(53, 53, 53); }

    DialogBase(wxWindow* parent, const wxString& title, long style = wxDEFAULT_DIALOG_STYLE);

protected:
    // Called after the face and frame lines are drawn, with the painted area's top-left corner.
    virtual void PaintDecoration(wxDC& dc, const wxPoint& origin) {}

private:
    void OnPaint(wxPaintEvent& event);
};
