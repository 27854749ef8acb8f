// The word list of the index pane: a virtual list box over every word of the
// word index, drawn as plain text rows of one height.
#pragma once

#include <wx/vlbox.h>

#include "wordindex/wordlist.h"

class QListBox : public wxVListBox {
 public:
  QListBox();
  QListBox(wxWindow* parent, wxWindowID id, const wxPoint& pos = wxDefaultPosition,
           const wxSize& size = wxDefaultSize);

  // Fills the list from the open word index, then creates the window.
  bool Create(wxWindow* parent, wxWindowID id, const wxPoint& pos = wxDefaultPosition,
              const wxSize& size = wxDefaultSize);

  // Empties the list, then fills it again from the word index now open
  // (after a new index was built).
  void Refill();

  // The word of row n, or an empty string outside the list.
  wxString GetString(int n) const;
  // The same word as the index holds it (8-bit), or "".
  const char* GetWord(int n) const;

  int RowHeight = 12;
  int WordCount = 0;
  WordListData Data;

 protected:
  void OnDrawItem(wxDC& dc, const wxRect& rect, size_t n) const override;
  wxCoord OnMeasureItem(size_t n) const override;

 private:
  void MeasureRowHeight();

  wxDECLARE_DYNAMIC_CLASS(QListBox);
  wxDECLARE_EVENT_TABLE();
};

// Row of the first word that starts with `text`, or with `exact` the row of
// the word equal to it; -1 when none (or when there is no list).
int FindWordInList(QListBox* list, const char* text, int exact);
