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
#include "window/tree_nodes.h"

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

// The tree building code works on the panel's nodes; the control gets its
// items as they are shown.
class TreeCtrlView : public DocumentTreeView {
 public:
  TreeCtrlView(wxTreeCtrl* tree, TreeNodes* nodes) : tree_(tree), nodes_(nodes) {}
  void Freeze() override { tree_->Freeze(); }
  void Thaw() override { tree_->Thaw(); }
  void DeleteAllItems() override { nodes_->Clear(); }
  Item GetRootItem() override { return nodes_->Root(); }
  Item AddRoot(const std::string& text) override { return nodes_->AddRoot(text); }
  Item AppendItem(Item parent, const std::string& text) override {
    return nodes_->Append(parent, text);
  }
  Item GetFirstChild(Item parent) override { return nodes_->FirstChild(parent); }
  Item GetNextChild(Item, Item previous) override { return nodes_->NextSibling(previous); }
  std::string GetItemText(Item item) override { return nodes_->Text(item); }

 private:
  wxTreeCtrl* tree_;
  TreeNodes* nodes_;
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
  TreeCtrlView view(panel->m_tree, panel->m_treeNodes.get());
  return Fill_Tree(view);
}
