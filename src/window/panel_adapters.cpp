// The panel seen through the display-free interfaces of the command
// processing and the tree building.
#include <wx/srchctrl.h>
#include <wx/treectrl.h>

#include <string>
#include <unordered_map>

#include "access/opendoc_gui.h"
#include "catalogue/tree.h"
#include "command/command.h"
#include "text/wxtext_gui.h"
#include "window/panel.h"
#include "window/qlistbox.h"

namespace {

class PanelCommands : public CommandPanel {
 public:
  explicit PanelCommands(Docuvane* panel) : panel_(panel) {}
  bool HasSearchControl() override { return panel_->m_search != nullptr; }
  void SetSearchValue(const std::string& text) override {
    // SetValue, unlike ChangeValue, sends the text event that runs OnSearch.
    panel_->m_search->SetValue(ToWx(text));
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
  void DeleteAllItems() override {
    tree_->DeleteAllItems();
    Texts().clear();
  }
  Item GetRootItem() override { return tree_->GetRootItem().GetID(); }
  Item AddRoot(const std::string& text) override { return Keep(tree_->AddRoot(ToWx(text)), text); }
  Item AppendItem(Item parent, const std::string& text) override {
    return Keep(tree_->AppendItem(wxTreeItemId(parent), ToWx(text)), text);
  }
  Item GetFirstChild(Item parent) override {
    wxTreeItemIdValue cookie;
    return tree_->GetFirstChild(wxTreeItemId(parent), cookie).GetID();
  }
  Item GetNextChild(Item, Item previous) override {
    return tree_->GetNextSibling(wxTreeItemId(previous)).GetID();
  }
  // The 8-bit text an item was made with, exactly: its display string read
  // back may differ when the locale cannot read every byte.
  std::string GetItemText(Item item) override {
    const auto kept = Texts().find(item);
    if (kept != Texts().end()) return kept->second;
    return FromWx(tree_->GetItemText(wxTreeItemId(item)));
  }

 private:
  static std::unordered_map<Item, std::string>& Texts() {
    static std::unordered_map<Item, std::string> texts;
    return texts;
  }
  static Item Keep(const wxTreeItemId& id, const std::string& text) {
    if (id.IsOk()) Texts()[id.GetID()] = text;
    return id.GetID();
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
  HighlightedItem = nullptr;
  TreeCtrlView view(panel->m_tree);
  return Fill_Tree(view);
}
