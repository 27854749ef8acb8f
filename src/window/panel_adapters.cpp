// The panel seen through the display-free interfaces of the command
// processing and the tree building.
#include <wx/srchctrl.h>
#include <wx/treectrl.h>

#include "access/opendoc_gui.h"
#include "catalogue/tree.h"
#include "command/command.h"
#include "window/panel.h"
#include "wordindex/qlistbox_gui.h"

namespace {

class PanelCommands : public CommandPanel {
 public:
  explicit PanelCommands(Docuvane* panel) : panel_(panel) {}
  bool HasSearchControl() override { return panel_->m_search != nullptr; }
  void SetSearchValue(const std::string& text) override {
    // SetValue, unlike ChangeValue, sends the text event that runs OnSearch.
    panel_->m_search->SetValue(wxString(text.c_str(), wxConvLocal));
  }
  bool HasWordList() override { return panel_->m_wordList != nullptr; }
  int FindWord(const char* text, int exact) override {
    return FindWordInList(panel_->m_wordList, text, exact);
  }
  void SelectWord(int row) override { panel_->m_wordList->SetSelection(row); }
  std::string GetWord(int row) override { return panel_->m_wordList->GetWord(row); }
  void ShowTopic(const char* word, int openIfSingle) override {
    Show_Topic(panel_, word, openIfSingle);
  }
  int OpenDocument(const char* path, const char* anchor) override {
    return OpenDocumentFile(panel_, path, anchor);
  }

 private:
  Docuvane* panel_;
};

// Tree items travel through the building code as wxTreeItemId's own pointer.
class TreeCtrlView : public DocumentTreeView {
 public:
  explicit TreeCtrlView(wxTreeCtrl* tree) : tree_(tree) {}
  void Freeze() override { tree_->Freeze(); }
  void Thaw() override { tree_->Thaw(); }
  void DeleteAllItems() override { tree_->DeleteAllItems(); }
  Item GetRootItem() override { return tree_->GetRootItem().GetID(); }
  Item AddRoot(const std::string& text) override { return tree_->AddRoot(ToDisplay(text)).GetID(); }
  Item AppendItem(Item parent, const std::string& text) override {
    return tree_->AppendItem(wxTreeItemId(parent), ToDisplay(text)).GetID();
  }
  Item GetFirstChild(Item parent) override {
    wxTreeItemIdValue cookie;
    return tree_->GetFirstChild(wxTreeItemId(parent), cookie).GetID();
  }
  Item GetNextChild(Item, Item previous) override {
    return tree_->GetNextSibling(wxTreeItemId(previous)).GetID();
  }
  std::string GetItemText(Item item) override {
    const wxString text = tree_->GetItemText(wxTreeItemId(item));
    wxCharBuffer narrow = text.mb_str(wxConvLocal);
    if (narrow.data() && (narrow.length() || text.empty())) return std::string(narrow.data(), narrow.length());
    wxCharBuffer latin = text.mb_str(wxConvISO8859_1);
    return latin.data() ? std::string(latin.data(), latin.length()) : std::string();
  }

 private:
  // A name that is not valid in the locale's encoding is shown byte for byte
  // rather than as an empty node.
  static wxString ToDisplay(const std::string& text) {
    wxString shown(text.c_str(), wxConvLocal);
    if (shown.empty() && !text.empty()) shown = wxString(text.c_str(), wxConvISO8859_1);
    return shown;
  }
  wxTreeCtrl* tree_;
};

}  // namespace

int ProcessCommand(Docuvane* panel, const char* command, int exact) {
  if (!panel) return 1;
  PanelCommands commands(panel);
  return ProcessCommand(commands, command, exact);
}

int Fill_Tree(Docuvane* panel) {
  if (!panel || !panel->m_tree) return 0;
  // Rebuilding deletes every item, the bold one too.
  HighlightedItem.Unset();
  TreeCtrlView view(panel->m_tree);
  return Fill_Tree(view);
}
