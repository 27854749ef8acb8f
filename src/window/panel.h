// The help panel: the document tree on the left, the index pane (search
// field, word list, Locations list and buttons) on the right.  The panel only
// builds the controls and routes their events; the lookups live in the
// word index and access code.
#pragma once

#include <wx/splitter.h>
#include <wx/treebase.h>

#include <memory>
#include <string>
#include <vector>

class wxButton;
class wxListBox;
class wxSearchCtrl;
class wxTreeCtrl;
class wxTreeEvent;
class QListBox;
class TreeNodes;

class Docuvane : public wxSplitterWindow {
 public:
  Docuvane(wxWindow* parent, const wxPoint& pos = wxDefaultPosition,
           const wxSize& size = wxDefaultSize);
  ~Docuvane() override;

  // Child windows, owned by the framework; any of them may be absent.
  wxTreeCtrl* m_tree = nullptr;
  // The tree's nodes, which the document table and the tree building hold
  // (items of the control are made as their parents are expanded).
  std::unique_ptr<TreeNodes> m_treeNodes;
  wxSearchCtrl* m_search = nullptr;
  QListBox* m_wordList = nullptr;
  wxListBox* m_targetList = nullptr;
  wxButton* m_gotoButton = nullptr;
  // The Locations list's rows as 8-bit texts, exactly as listed.
  std::vector<std::string> m_locationTexts;
  wxSplitterWindow* m_splitter = nullptr;

  // A picture button from the icon theme when `iconName` is installed, else
  // a text button with `label`.
  static wxButton* MakeIconButton(wxWindow* parent, int id, const char* label, const char* iconName,
                                  const char* toolTip, const wxSize& size);

  // Index pane (wordindex/index_pane_gui.cpp).
  void OnSearch(wxCommandEvent& event);
  void OnIndexChanged(wxCommandEvent& event);
  void OnTargetChanged(wxCommandEvent& event);
  void OnTargetActivate(wxCommandEvent& event);
  void OnGotoTarget(wxCommandEvent& event);
  // Document tree (access/tree_handlers_gui.cpp).
  void OnTreeActivate(wxTreeEvent& event);
  void OnOpenDoc(wxCommandEvent& event);
  // Opens the document that `item` shows; 0 when it shows none.
  int Open_Document(const wxTreeItemId& item);
  // Layout.
  void OnSashMove(wxSplitterEvent& event);

 private:
  wxDECLARE_EVENT_TABLE();
};

// Fills the Locations list with the places of `word`; opens the document
// when the word has exactly one keyword target and `openIfSingle` is set.
void Show_Topic(Docuvane* panel, const char* word, int openIfSingle);

// Selects and bolds the tree node of the document a location text names.
void HighlightDocument(Docuvane* panel, const char* text);

// Runs a command (a word to look up or a dotted keyword topic) on the panel.
int ProcessCommand(Docuvane* panel, const char* command, int exact);

// Rebuilds the panel's document tree from DocumentTable; returns 0.
int Fill_Tree(Docuvane* panel);
