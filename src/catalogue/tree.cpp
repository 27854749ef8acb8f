// The document tree: every document's Name is a path of tree levels
// separated by ">", the last part being the document's own leaf.
#include "catalogue/tree.h"

#include <cstdint>
#include <cstring>
#include <functional>
#include <string>
#include <unordered_map>

#include "catalogue/documents.h"
#include "text/text.h"

namespace {

using Item = DocumentTreeView::Item;

// The node created or reused last at the first level, and the one created
// last under it at the second: documents of one category follow each other
// in the table, so one comparison usually finds their category.
struct CachedNode {
  std::string name;
  Item item = nullptr;
};
CachedNode g_level1;
CachedNode g_level2;

// While Fill_Tree builds the tree, every node it appends is also kept here
// by parent and folded text, so that finding a child below the second level
// does not mean reading every sibling's text.  The first child of a text
// wins, as a search from the first child would find it.
struct ChildKey {
  Item parent;
  std::string text;
  bool operator==(const ChildKey& other) const {
    return parent == other.parent && text == other.text;
  }
};
struct ChildKeyHash {
  std::size_t operator()(const ChildKey& key) const {
    return std::hash<std::string>()(key.text) ^
           (std::hash<std::uintptr_t>()(reinterpret_cast<std::uintptr_t>(key.parent)) * 31);
  }
};
bool g_building = false;
std::unordered_map<ChildKey, Item, ChildKeyHash> g_children;

bool SameName(const std::string& a, const std::string& b) {
  return CompareIgnoringCase(a.c_str(), b.c_str()) == 0;
}

Item FindChild(DocumentTreeView& tree, Item parent, const std::string& segment) {
  if (g_building) {
    auto it = g_children.find(ChildKey{parent, Folded(segment)});
    return it == g_children.end() ? nullptr : it->second;
  }
  for (Item child = tree.GetFirstChild(parent); child != nullptr;
       child = tree.GetNextChild(parent, child))
    if (SameName(tree.GetItemText(child), segment)) return child;
  return nullptr;
}

// An existing node that stands for `segment` below `parent`, or NULL.  A
// cache counts only while it holds an item: an emptied cache must not match
// an empty name part.
Item FindNode(DocumentTreeView& tree, Item root, Item parent, const std::string& segment) {
  if (parent == root) {
    if (g_level1.item != nullptr && SameName(g_level1.name, segment)) return g_level1.item;
    return nullptr;
  }
  if (parent == g_level1.item) {
    if (g_level2.item != nullptr && SameName(g_level2.name, segment)) return g_level2.item;
    return nullptr;
  }
  return FindChild(tree, parent, segment);
}

Item AppendNode(DocumentTreeView& tree, Item root, Item parent, const std::string& text) {
  Item item = tree.AppendItem(parent, text);
  if (item == nullptr) return nullptr;
  if (g_building) g_children.emplace(ChildKey{parent, Folded(text)}, item);
  if (parent == root) {
    g_level1 = CachedNode{text, item};
    g_level2 = CachedNode{};
  } else if (parent == g_level1.item) {
    g_level2 = CachedNode{text, item};
  }
  return item;
}

}  // namespace

Item HighlightedItem = nullptr;

Item InsertPath(DocumentTreeView& tree, const char* path, Item root, Item parent,
                int /*documentIndex*/) {
  // One level per turn rather than one call per level: a name may hold any
  // number of ">".
  const char* rest = path;
  for (;;) {
    const char* separator = std::strchr(rest, '>');
    if (separator == nullptr) return AppendNode(tree, root, parent, rest);
    const std::string segment(rest, static_cast<std::size_t>(separator - rest));
    Item node = FindNode(tree, root, parent, segment);
    if (node == nullptr) node = AppendNode(tree, root, parent, segment);
    if (node == nullptr) return nullptr;
    parent = node;
    rest = separator + 1;
  }
}

Item AddDocumentNode(DocumentTreeView& tree, const char* name, int documentIndex) {
  Item root = tree.GetRootItem();
  if (root == nullptr) root = tree.AddRoot("");
  if (root == nullptr) return nullptr;
  return InsertPath(tree, name, root, root, documentIndex);
}

int Fill_Tree(DocumentTreeView& tree) {
  tree.Freeze();
  g_level1 = CachedNode{};
  g_level2 = CachedNode{};
  tree.DeleteAllItems();
  for (int i = 0; i < DocumentCount; ++i) DocumentTable[i].TreeItem = nullptr;

  g_children.clear();
  g_building = true;
  for (int i = 0; i < DocumentCount; ++i)
    DocumentTable[i].TreeItem = AddDocumentNode(tree, DocumentTable[i].Name.c_str(), i);
  g_building = false;
  g_children.clear();

  tree.Thaw();
  return 0;
}
