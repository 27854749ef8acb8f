// The word list control: loading through Fill_WordIndex, fixed-height rows.
#include "window/qlistbox.h"

#include <wx/dc.h>
#include <wx/dcscreen.h>
#include <wx/settings.h>

#include "trovlib/trovlib.h"

namespace {

// Every letter, so that the measured height covers ascenders and descenders.
const char kSample[] = "qwertyuiopasdfghjklzxcvbnmQWERTYUIOPASDFGHJKLZXCVBNM";
constexpr int kFallbackRowHeight = 32;

}  // namespace

wxIMPLEMENT_DYNAMIC_CLASS(QListBox, wxVListBox);

wxBEGIN_EVENT_TABLE(QListBox, wxVListBox)
wxEND_EVENT_TABLE()

QListBox::QListBox() {
  MeasureRowHeight();
  SetMargins(8, 0);
}

QListBox::QListBox(wxWindow* parent, wxWindowID id, const wxPoint& pos, const wxSize& size) {
  MeasureRowHeight();
  SetMargins(8, 0);
  Create(parent, id, pos, size);
}

bool QListBox::Create(wxWindow* parent, wxWindowID id, const wxPoint& pos, const wxSize& size) {
  // The count is known at once; the order only when a row is first read,
  // so the sort runs beside the rest of the window's construction.  A fill
  // started before the toolkit is taken over.
  const int started = Take_Started_Fill(Data);
  if (started < 0) Fill_WordIndex(Data, true);
  WordCount = started >= 0 ? started : static_cast<int>(Data.Words.size());
  const bool created = wxVListBox::Create(parent, id, pos, size, 0, wxVListBoxNameStr);
  SetItemCount(static_cast<size_t>(WordCount));
  MeasureRowHeight();
  return created;
}

void QListBox::Refill() {
  // The rows point into Data: the control forgets them before they go.
  SetItemCount(0);
  Fill_WordIndex(Data, true);
  WordCount = static_cast<int>(Data.Words.size());
  SetItemCount(static_cast<size_t>(WordCount));
  Refresh();
}

void QListBox::MeasureRowHeight() {
  int width = 0, height = 0, descent = 0, leading = 0;
  if (GetHandle()) {
    GetTextExtent(kSample, &width, &height, &descent, &leading);
  } else {
    // Not created yet: measure in the font the window will get.
    wxScreenDC dc;
    dc.SetFont(wxSystemSettings::GetFont(wxSYS_DEFAULT_GUI_FONT));
    dc.GetTextExtent(kSample, &width, &height, &descent, &leading);
  }
  RowHeight = height + descent;
  if (RowHeight <= 0) {
    TrovMessage("WARNING: QListBox: ", "adjust base unit to some defaults", 4);
    RowHeight = kFallbackRowHeight;
  }
}

const char* QListBox::GetWord(int n) const {
  Data.Wait();
  if (n < 0 || n >= WordCount || n >= static_cast<int>(Data.Words.size())) return "";
  return Data.Words[static_cast<size_t>(n)];
}

wxString QListBox::GetString(int n) const { return wxString(GetWord(n)); }

void QListBox::OnDrawItem(wxDC& dc, const wxRect& rect, size_t n) const {
  Data.Wait();
  if (n >= static_cast<size_t>(WordCount) || n >= Data.Words.size()) return;
  dc.DrawText(wxString(Data.Words[n]), rect.GetTopLeft());
}

wxCoord QListBox::OnMeasureItem(size_t) const { return RowHeight; }

int FindWordInList(QListBox* list, const char* text, int exact) {
  if (!list || !text) return -1;
  list->Data.Wait();
  return FindWordInList(list->Data.Words, text, exact);
}
