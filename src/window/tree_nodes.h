// The document tree's nodes, kept beside the tree control.  A node gets its
// control item only when its parent is first expanded, or when it must be
// shown (a location's document): a catalogue of thousands of documents
// starts with the items of its first level alone.  Nodes are what the tree
// building code and the document table hold; their texts are the 8-bit
// texts they were made with.
#pragma once

#include <wx/treectrl.h>

#include <deque>
#include <string>
#include <unordered_map>
#include <vector>

class TreeNodes {
 public:
  // Adds the children of a node to the control as it is expanded.
  explicit TreeNodes(wxTreeCtrl* tree);

  void Clear();
  void* Root() const { return nodes_.empty() ? nullptr : &nodes_.front(); }
  void* AddRoot(const std::string& text);
  void* Append(void* parent, const std::string& text);
  void* FirstChild(void* node) const;
  void* NextSibling(void* node) const;
  const std::string& Text(void* node) const;

  // The control's item of `node`, made (with its parents' other children)
  // when it has none yet; an invalid item for no node.
  wxTreeItemId ItemOf(void* node);
  // The node an item of the control shows, or nullptr.
  void* NodeOf(const wxTreeItemId& item) const;

 private:
  struct Node {
    Node* parent;
    std::string text;
    std::size_t index;  // among its parent's children
    std::vector<Node*> children;
    wxTreeItemId item;
    bool childrenShown = false;
  };
  void ShowChildren(Node* node);
  void Show(Node* node);

  wxTreeCtrl* tree_;
  mutable std::deque<Node> nodes_;
  std::unordered_map<void*, Node*> byItem_;
};
