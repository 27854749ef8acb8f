// The index pane at work: the search field selects a word, a word fills the
// Locations list, a location is shown in the tree and opened.
#include <wx/button.h>
#include <wx/listbox.h>
#include <wx/srchctrl.h>
#include <wx/treectrl.h>

#include <cstring>
#include <string>
#include <vector>

#include "access/opendoc_gui.h"
#include "catalogue/documents.h"
#include "catalogue/keywords.h"
#include "catalogue/tree.h"
#include "text/text.h"
#include "text/wxtext_gui.h"
#include "trovlib/trovlib.h"
#include "window/panel.h"
#include "window/qlistbox.h"
#include "window/tree_nodes.h"
#include "wordindex/references.h"
#include "wordindex/wordindex.h"

namespace {

// The 8-bit text of the selected row, exactly as it was listed: a display
// string read back could name another file (a byte the locale cannot read
// is shown as a Latin-1 character, and converts back as something else).
std::string SelectedLocation(Docuvane* panel, int* row) {
  *row = panel->m_targetList ? panel->m_targetList->GetSelection() : wxNOT_FOUND;
  if (*row == wxNOT_FOUND) return std::string();
  if (static_cast<std::size_t>(*row) < panel->m_locationTexts.size())
    return panel->m_locationTexts[static_cast<std::size_t>(*row)];
  return FromWx(panel->m_targetList->GetString(static_cast<unsigned>(*row)));
}

void AppendLocations(Docuvane* panel, const std::vector<std::string>& items) {
  wxArrayString texts;
  for (const std::string& item : items) texts.Add(ToWx(item));
  panel->m_targetList->Append(texts);
  panel->m_locationTexts.insert(panel->m_locationTexts.end(), items.begin(), items.end());
}

}  // namespace

void Show_Topic(Docuvane* panel, const char* word, int openIfSingle) {
  if (!word) word = "";
  TrovMessage("INFO: Docuvane::Show_Topic ", word, 3);
  if (!panel) return;
  wxListBox* locations = panel->m_targetList;
  if (locations) locations->Clear();
  panel->m_locationTexts.clear();
  if (panel->m_gotoButton) panel->m_gotoButton->Disable();
  if (HighlightedItem != nullptr) {
    if (panel->m_tree)
      panel->m_tree->SetItemBold(panel->m_treeNodes->ItemOf(HighlightedItem), false);
    HighlightedItem = nullptr;
  }

  const KeywordTargets targets = CollectKeywordTargets(word);
  if (locations && !targets.items.empty()) {
    AppendLocations(panel, targets.items);
    // Selecting in code sends no event: "&Go To" waits for the user's choice.
    locations->SetSelection(0);
  }
  if (openIfSingle && targets.single)
    OpenDocumentFile(panel, targets.singlePath.c_str(), targets.singleAnchor.c_str());

  if (WordIndexHandle) {
    const int32_t offset = FindIndexWord(word);
    if (offset != 0) {
      std::vector<std::string> items;
      LoadWordReferences(offset, word, items);
      if (locations && !items.empty()) AppendLocations(panel, items);
    }
  }
}

void HighlightDocument(Docuvane* panel, const char* text) {
  if (!panel || !text) return;
  // The document part of a location: up to the first "#", within 511 bytes.
  std::string document(text, strnlen(text, 511));
  const std::string::size_type hash = document.find('#');
  if (hash != std::string::npos) document.resize(hash);

  int found = -1;
  for (int i = 0; i < DocumentCount; ++i) {
    if (CompareIgnoringCase(DocumentTable[i].Path.c_str(), document.c_str()) == 0) {
      found = i;
      break;
    }
  }
  if (found < 0 || !DocumentTable[found].TreeItem || !panel->m_tree) return;

  // Its item is made if its branch was never opened.
  const wxTreeItemId item = panel->m_treeNodes->ItemOf(DocumentTable[found].TreeItem);
  if (!item.IsOk()) return;
  panel->m_tree->SelectItem(item);
  if (HighlightedItem != nullptr)
    panel->m_tree->SetItemBold(panel->m_treeNodes->ItemOf(HighlightedItem), false);
  panel->m_tree->SetItemBold(item, true);
  HighlightedItem = DocumentTable[found].TreeItem;
}

void Docuvane::OnSearch(wxCommandEvent&) {
  if (!m_search) return;
  const std::string text = FromWx(m_search->GetValue());
  TrovMessage("INFO: Docuvane::OnSearch of ", text.c_str(), 3);
  if (text.empty() || !m_wordList) return;
  const int row = FindWordInList(m_wordList, text.c_str(), 0);
  if (row < 0) return;  // keep the previous word and its locations
  m_wordList->SetSelection(row);
  Show_Topic(this, m_wordList->GetWord(row), 0);
}

void Docuvane::OnIndexChanged(wxCommandEvent&) {
  if (!m_wordList) return;
  const int row = m_wordList->GetSelection();
  if (row == wxNOT_FOUND) {
    TrovMessage("WARNING: Docuvane::OnIndexChanged ", "no selection in index", 4);
    return;
  }
  const char* word = m_wordList->GetWord(row);
  TrovMessage("INFO: Docuvane::OnIndexChanged to ", word, 3);
  Show_Topic(this, word, 0);
}

void Docuvane::OnTargetChanged(wxCommandEvent&) {
  TrovMessage("INFO: Docuvane::OnTargetChanged ", "", 3);
  if (!m_targetList) return;
  int row;
  const std::string text = SelectedLocation(this, &row);
  if (row != wxNOT_FOUND) {
    if (m_gotoButton) m_gotoButton->Enable();
    HighlightDocument(this, text.c_str());
  } else if (m_gotoButton) {
    m_gotoButton->Disable();
  }
}

void Docuvane::OnTargetActivate(wxCommandEvent&) {
  TrovMessage("INFO: Docuvane::OnTargetActivate ", "", 3);
  if (!m_targetList) return;
  int row;
  const std::string text = SelectedLocation(this, &row);
  if (row == wxNOT_FOUND) {
    TrovMessage("WARNING: Docuvane::OnTargetActivate ", "no selection in index", 4);
    return;
  }
  OpenDocumentFile(this, text.c_str(), nullptr);
}

void Docuvane::OnGotoTarget(wxCommandEvent&) {
  if (!m_targetList) return;
  int row;
  const std::string text = SelectedLocation(this, &row);
  if (row == wxNOT_FOUND) return;
  TrovMessage("INFO: Docuvane::OnGotoTarget ", text.c_str(), 3);
  OpenDocumentFile(this, text.c_str(), nullptr);
}
