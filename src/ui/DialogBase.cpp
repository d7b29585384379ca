#include "ui/DialogBase.h"

#include <wx/dcclient.h>

DialogBase::DialogBase(wxWindow* parent, const wxString& title, long style)
    : wxDialog(parent, wxID_ANY, title, wxDefaultPosition, wxDefaultSize, style) {
    SetBackgroundColour(BackgroundColour());
    Bind(wxEVT_PAINT, &DialogBase::OnPaint, this);
}

void DialogBase::OnPaint(wxPaintEvent&) {
    wxPaintDC dc(this);
    const wxRect area(wxPoint(0, 0), GetClientSize());
    if (area.IsEmpty()) return;
    dc.SetPen(*wxTRANSPARENT_PEN);
    dc.SetBrush(wxBrush(BackgroundColour()));
    dc.DrawRectangle(area);
    dc.SetPen(wxPen(FrameColour(), 1));
    const int right = area.GetRight();
    const int bottom = area.GetBottom();
    dc.DrawLine(area.GetLeft(), area.GetTop(), right + 1, area.GetTop());
    dc.DrawLine(area.GetLeft(), area.GetTop(), area.GetLeft(), bottom + 1);
    dc.DrawLine(right, area.GetTop(), right, bottom + 1);
    PaintDecoration(dc, area.GetTopLeft());
}
