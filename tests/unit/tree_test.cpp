#include "catalogue/tree.h"

#include <gtest/gtest.h>

#include <strings.h>

#include <algorithm>
#include <memory>
#include <string>
#include <vector>

#include "catalogue/documents.h"

namespace {

// An in-memory tree with the behaviour of the tree control that the
// building relies on.
class FakeTree : public DocumentTreeView {
 public:
  struct Node {
    std::string text;
    Node* parent = nullptr;
    std::vector<Node*> children;
  };

  void Freeze() override { ++freezes; }
  void Thaw() override { ++thaws; }
  void DeleteAllItems() override { nodes_.clear(); }
  Item GetRootItem() override { return nodes_.empty() ? nullptr : nodes_.front().get(); }
  Item AddRoot(const std::string& text) override { return NewNode(text, nullptr); }
  Item AppendItem(Item parent, const std::string& text) override {
    return NewNode(text, static_cast<Node*>(parent));
  }
  Item GetFirstChild(Item parent) override { return ChildAfter(parent, nullptr); }
  Item GetNextChild(Item parent, Item previous) override { return ChildAfter(parent, previous); }
  std::string GetItemText(Item item) override { return static_cast<Node*>(item)->text; }

  // The tree below the root as "text(children...)", empty texts as ''.
  std::string Outline() { return Children(static_cast<Node*>(GetRootItem())); }
  // An item's texts from the first level down, ">" between them.
  static std::string PathOf(Item item) {
    std::vector<std::string> parts;
    for (Node* n = static_cast<Node*>(item); n && n->parent; n = n->parent) parts.push_back(n->text);
    std::string path;
    for (auto it = parts.rbegin(); it != parts.rend(); ++it)
      path += (it == parts.rbegin() ? "" : ">") + *it;
    return path;
  }

  int freezes = 0;
  int thaws = 0;

 private:
  Node* NewNode(const std::string& text, Node* parent) {
    nodes_.push_back(std::make_unique<Node>(Node{text, parent, {}}));
    if (parent) parent->children.push_back(nodes_.back().get());
    return nodes_.back().get();
  }
  static Item ChildAfter(Item parent, Item previous) {
    auto& c = static_cast<Node*>(parent)->children;
    auto it = previous ? std::find(c.begin(), c.end(), previous) + 1 : c.begin();
    return it < c.end() ? *it : nullptr;
  }
  static std::string Children(const Node* n) {
    std::string out;
    for (const Node* c : n ? n->children : std::vector<Node*>{}) {
      out += (out.empty() ? "" : " ") + (c->text.empty() ? "''" : c->text);
      if (!c->children.empty()) out += "(" + Children(c) + ")";
    }
    return out;
  }

  std::vector<std::unique_ptr<Node>> nodes_;
};

void SetDocuments(const std::vector<std::string>& names) {
  for (int i = 0; i < DocumentCount; ++i) DocumentTable[i] = DocumentEntry{};
  DocumentCount = static_cast<int>(names.size());
  for (int i = 0; i < DocumentCount; ++i) DocumentTable[i].Name = names[i];
}

class TreeTest : public ::testing::Test {
 protected:
  void TearDown() override { SetDocuments({}); }
};

TEST_F(TreeTest, LayoutFollowsTheTwoCachesAndTheChildSearch) {
  struct Row {
    const char* what;
    std::vector<std::string> names;
    std::string outline;
  };
  const Row rows[] = {
      {"categories shared by neighbours",
       {"Manuals>LaTeX>Guide", "Manuals>LaTeX>Reference", "Manuals>Fonts>Catalogue"},
       "Manuals(LaTeX(Guide Reference) Fonts(Catalogue))"},
      {"only the last second-level node is remembered",
       {"A>B>x", "A>C>y", "A>B>z"},
       "A(B(x) C(y) B(z))"},
      {"third level found among the children",
       {"Fonts>Type1>Courier>Manual", "Fonts>Type1>Times>Manual", "Fonts>Type1>Courier>Table"},
       "Fonts(Type1(Courier(Manual Table) Times(Manual)))"},
      {"names compare ignoring case, the first text stays",
       {"Manuals>y", "manuals>x", "MANUALS>LaTeX>a", "Manuals>latex>b"},
       "Manuals(y x LaTeX(a b))"},
      {"a first-level category is not found once another came between",
       {"A>x", "B>y", "A>z"},
       "A(x) B(y) A(z)"},
      {"a name without > is a leaf at the root",
       {"Readme", "Cat>x"},
       "Readme Cat(x)"},
      {"a trailing > gives a leaf with empty text",
       {"Cat>", "Cat>Sub>"},
       "Cat('' Sub(''))"},
      {"two documents of one name get two leaves",
       {"Cat>Doc", "Cat>Doc"},
       "Cat(Doc Doc)"},
      {"an empty first part does not match the emptied cache",
       {">x", ">y"},
       "''(x y)"},
      {"an emptied second-level cache does not match an empty part",
       {"M>L>g", "B>y", "B>>z"},
       "M(L(g)) B(y ''(z))"},
      {"long name parts are compared whole",
       {"C>S>" + std::string(200, 'a') + "1>x", "C>S>" + std::string(200, 'a') + "2>y",
        "C>S>" + std::string(200, 'a') + "1>z"},
       "C(S(" + std::string(200, 'a') + "1(x z) " + std::string(200, 'a') + "2(y)))"},
      {"deep levels share nodes",
       {"a>b>c>d>e>f", "a>b>c>d>e>g", "a>b>c>D>h"},
       "a(b(c(d(e(f g) h))))"},
  };
  for (const Row& row : rows) {
    SetDocuments(row.names);
    FakeTree tree;
    EXPECT_EQ(Fill_Tree(tree), 0);
    EXPECT_EQ(tree.Outline(), row.outline) << row.what;
    EXPECT_EQ(tree.freezes, 1);
    EXPECT_EQ(tree.thaws, 1);
    for (int i = 0; i < DocumentCount; ++i) {
      ASSERT_NE(DocumentTable[i].TreeItem, nullptr) << row.what;
      EXPECT_EQ(strcasecmp(FakeTree::PathOf(DocumentTable[i].TreeItem).c_str(),
                           row.names[i].c_str()),
                0)
          << row.what << ": leaf of " << row.names[i];
    }
  }
}

TEST_F(TreeTest, RebuildStartsFromAnEmptyTree) {
  SetDocuments({"A>x", "B>y"});
  FakeTree tree;
  Fill_Tree(tree);
  SetDocuments({"A>z"});
  Fill_Tree(tree);
  EXPECT_EQ(tree.Outline(), "A(z)");
  EXPECT_EQ(FakeTree::PathOf(DocumentTable[0].TreeItem), "A>z");
}

TEST_F(TreeTest, AddDocumentNodeAfterTheBuildKeepsCachesAndSearchesChildren) {
  SetDocuments({"A>B>C>x", "Z>y"});
  FakeTree tree;
  Fill_Tree(tree);
  AddDocumentNode(tree, "z>Y>k>m", 2);  // Z and y from the caches, k new
  DocumentTreeView::Item leaf = AddDocumentNode(tree, "Z>y>K>n", 3);
  EXPECT_EQ(tree.Outline(), "A(B(C(x))) Z(y(k(m n)))");
  EXPECT_EQ(FakeTree::PathOf(leaf), "Z>y>k>n");

  FakeTree empty;
  EXPECT_NE(AddDocumentNode(empty, "solo", 0), nullptr);
  EXPECT_NE(empty.GetRootItem(), nullptr) << "the root is made when missing";
  EXPECT_EQ(empty.Outline(), "solo");
}

}  // namespace
