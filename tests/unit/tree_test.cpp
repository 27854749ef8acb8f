#include "catalogue/tree.h"

#include <gtest/gtest.h>

#include <strings.h>

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
  void DeleteAllItems() override {
    nodes_.clear();
    root_ = nullptr;
  }
  Item GetRootItem() override { return root_; }
  Item AddRoot(const std::string& text) override {
    root_ = NewNode(text, nullptr);
    return root_;
  }
  Item AppendItem(Item parent, const std::string& text) override {
    Node* node = NewNode(text, static_cast<Node*>(parent));
    static_cast<Node*>(parent)->children.push_back(node);
    return node;
  }
  Item GetFirstChild(Item parent) override {
    auto& c = static_cast<Node*>(parent)->children;
    return c.empty() ? nullptr : c.front();
  }
  Item GetNextChild(Item parent, Item previous) override {
    auto& c = static_cast<Node*>(parent)->children;
    for (std::size_t i = 0; i + 1 < c.size(); ++i)
      if (c[i] == previous) return c[i + 1];
    return nullptr;
  }
  std::string GetItemText(Item item) override { return static_cast<Node*>(item)->text; }

  // The tree below the root as "text(children...)" with children in order.
  std::string Outline() const { return root_ ? Children(root_) : "<no root>"; }
  // The path of an item from the first level, ">" between levels.
  static std::string PathOf(Item item) {
    std::string path;
    bool first = true;
    for (Node* n = static_cast<Node*>(item); n && n->parent; n = n->parent) {
      path = first ? n->text : n->text + ">" + path;
      first = false;
    }
    return path;
  }

  int freezes = 0;
  int thaws = 0;

 private:
  Node* NewNode(const std::string& text, Node* parent) {
    nodes_.push_back(std::make_unique<Node>());
    nodes_.back()->text = text;
    nodes_.back()->parent = parent;
    return nodes_.back().get();
  }
  static std::string Children(const Node* n) {
    std::string out;
    for (const Node* c : n->children) {
      if (!out.empty()) out += ' ';
      out += c->text.empty() ? "''" : c->text;
      if (!c->children.empty()) out += "(" + Children(c) + ")";
    }
    return out;
  }

  std::vector<std::unique_ptr<Node>> nodes_;
  Node* root_ = nullptr;
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

TEST_F(TreeTest, LongNamePartsAreKeptWhole) {
  const std::string a(200, 'a');
  SetDocuments({"Cat>Sub>" + a + "1>x", "Cat>Sub>" + a + "2>y", "Cat>Sub>" + a + "1>z"});
  FakeTree tree;
  Fill_Tree(tree);
  EXPECT_EQ(tree.Outline(), "Cat(Sub(" + a + "1(x z) " + a + "2(y)))");
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
