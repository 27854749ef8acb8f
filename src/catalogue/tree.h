// Building the document tree from DocumentTable.  The tree control is reached
// through this small interface so that the building rules can be tested
// without a display; the panel hands in an adapter over its wxTreeCtrl.
#pragma once

#include <string>

class DocumentTreeView {
 public:
  using Item = void*;  // NULL is "no item"
  virtual ~DocumentTreeView() = default;
  virtual void Freeze() = 0;
  virtual void Thaw() = 0;
  virtual void DeleteAllItems() = 0;
  virtual Item GetRootItem() = 0;
  virtual Item AddRoot(const std::string& text) = 0;
  virtual Item AppendItem(Item parent, const std::string& text) = 0;
  // Children in order: first, then next after `previous`; NULL at the end.
  virtual Item GetFirstChild(Item parent) = 0;
  virtual Item GetNextChild(Item parent, Item previous) = 0;
  virtual std::string GetItemText(Item item) = 0;
};

// The tree item shown in bold as the document of the selected location;
// NULL when none.
extern DocumentTreeView::Item HighlightedItem;

int Fill_Tree(DocumentTreeView& tree);
DocumentTreeView::Item AddDocumentNode(DocumentTreeView& tree, const char* name, int documentIndex);

// One step of the insertion: `path` below `parent`; returns the leaf item.
// Name parts are compared and inserted whole, whatever their length.
DocumentTreeView::Item InsertPath(DocumentTreeView& tree, const char* path,
                                  DocumentTreeView::Item root, DocumentTreeView::Item parent,
                                  int documentIndex);
