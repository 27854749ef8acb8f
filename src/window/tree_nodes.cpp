#include "window/tree_nodes.h"

#include "text/wxtext_gui.h"

TreeNodes::TreeNodes(wxTreeCtrl* tree) : tree_(tree) {
  tree_->Bind(wxEVT_TREE_ITEM_EXPANDING, [this](wxTreeEvent& event) {
    if (Node* node = static_cast<Node*>(NodeOf(event.GetItem()))) ShowChildren(node);
    event.Skip();
  });
}

void TreeNodes::Clear() {
  tree_->DeleteAllItems();
  nodes_.clear();
  byItem_.clear();
}

void* TreeNodes::AddRoot(const std::string& text) {
  Clear();
  nodes_.push_back(Node{nullptr, text, 0, {}, {}, true});
  Node* root = &nodes_.back();
  root->item = tree_->AddRoot(ToWx(text));
  byItem_[root->item.GetID()] = root;
  return root;
}

void* TreeNodes::Append(void* parentNode, const std::string& text) {
  Node* parent = static_cast<Node*>(parentNode);
  if (parent == nullptr) return nullptr;
  nodes_.push_back(Node{parent, text, parent->children.size(), {}, {}, false});
  Node* node = &nodes_.back();
  parent->children.push_back(node);
  if (parent->childrenShown)
    Show(node);
  else if (parent->children.size() == 1 && parent->item.IsOk())
    tree_->SetItemHasChildren(parent->item, true);
  return node;
}

void* TreeNodes::FirstChild(void* node) const {
  const Node* n = static_cast<const Node*>(node);
  return n != nullptr && !n->children.empty() ? n->children.front() : nullptr;
}

void* TreeNodes::NextSibling(void* node) const {
  const Node* n = static_cast<const Node*>(node);
  if (n == nullptr || n->parent == nullptr) return nullptr;
  const std::vector<Node*>& siblings = n->parent->children;
  return n->index + 1 < siblings.size() ? siblings[n->index + 1] : nullptr;
}

const std::string& TreeNodes::Text(void* node) const {
  static const std::string none;
  return node != nullptr ? static_cast<const Node*>(node)->text : none;
}

wxTreeItemId TreeNodes::ItemOf(void* nodePointer) {
  Node* node = static_cast<Node*>(nodePointer);
  if (node == nullptr) return wxTreeItemId();
  if (!node->item.IsOk() && node->parent != nullptr) {
    ItemOf(node->parent);
    ShowChildren(node->parent);
  }
  return node->item;
}

void* TreeNodes::NodeOf(const wxTreeItemId& item) const {
  const auto found = byItem_.find(item.GetID());
  return found == byItem_.end() ? nullptr : found->second;
}

void TreeNodes::ShowChildren(Node* node) {
  if (node->childrenShown) return;
  node->childrenShown = true;
  for (Node* child : node->children) Show(child);
}

void TreeNodes::Show(Node* node) {
  node->item = tree_->AppendItem(node->parent->item, ToWx(node->text));
  byItem_[node->item.GetID()] = node;
  if (!node->children.empty()) tree_->SetItemHasChildren(node->item, true);
}
