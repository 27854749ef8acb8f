// The catalogue: document table, key lists, document tree.
#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <deque>
#include <sstream>
#include <thread>
#include <tuple>

#include "base/settings.h"
#include "base/trace.h"
#include "catalogue/documents.h"
#include "catalogue/keywords.h"
#include "catalogue/pool.h"
#include "catalogue/tree.h"
#include "platform/profile.h"
#include "test_support.h"
#include "text/text.h"
#include "wordindex/wordindex.h"

namespace {

using testing_support::MessageCapture;

// Every node after the head as "keyword: anchor@document ..." (newest first), one per line.
std::string DumpList() {
  std::string dump;
  for (const KeywordNode* n = KeywordListHead.Next; n != &KeywordListEnd; n = n->Next) {
    dump += std::string(n->Keyword) + ":";
    for (const KeywordTarget* t = n->Targets; t; t = t->Next)
      dump += " " + std::string(t->Anchor) + "@" + std::to_string(t->DocumentIndex);
    dump += "\n";
  }
  return dump;
}

// A word index without words that holds the given labels (the writer refuses long ones).
std::string IndexBytes(const std::vector<std::string>& labels) {
  std::string bytes = "WX\x01\x01";
  auto put = [&bytes](uint32_t v, int width) {
    while (width-- > 0) bytes += static_cast<char>(v >> (8 * width));
  };
  uint32_t at = static_cast<uint32_t>(14 + 3 * (labels.size() + 1));
  put(at, 4), put(at, 4), put(static_cast<uint32_t>(labels.size()), 2);
  for (const std::string& label : labels) put(at, 3), at += static_cast<uint32_t>(label.size());
  put(at, 3);
  for (const std::string& label : labels) bytes += label;
  return bytes;
}

// An in-memory tree control; deleted nodes stay allocated.
struct FakeTree : DocumentTreeView {
  struct Node {
    std::string text;
    std::vector<Node*> children;
  };
  static Node* N(Item item) { return static_cast<Node*>(item); }
  void Freeze() override {}
  void Thaw() override {}
  void DeleteAllItems() override { root = nullptr; }
  Item GetRootItem() override { return root; }
  Item AddRoot(const std::string& text) override {
    return root = &nodes.emplace_back(Node{text, {}});
  }
  Item AppendItem(Item parent, const std::string& text) override {
    return N(parent)->children.emplace_back(&nodes.emplace_back(Node{text, {}}));
  }
  Item GetFirstChild(Item parent) override { return GetNextChild(parent, nullptr); }
  Item GetNextChild(Item parent, Item previous) override {
    auto& c = N(parent)->children;
    auto it = previous ? std::find(c.begin(), c.end(), previous) + 1 : c.begin();
    return it < c.end() ? *it : nullptr;
  }
  std::string GetItemText(Item item) override { return N(item)->text; }
  // The tree below `n` as "text(children...)", empty texts as ''.
  static std::string Outline(const Node* n) {
    std::string out;
    for (const Node* c : n->children)
      out += (out.empty() ? "" : " ") + (c->text.empty() ? "''" : c->text) +
             (c->children.empty() ? "" : "(" + Outline(c) + ")");
    return out;
  }
  std::deque<Node> nodes;
  Node* root = nullptr;
};

class CatalogueTest : public ::testing::Test {
 protected:
  void SetUp() override { ProfileCacheClear(); }
  void TearDown() override {
    CloseWordIndex(), SetDocuments(""), KeywordListReset(), PoolReset();
    IniFilePath = saved_ini_;
  }
  static void SetDocuments(const std::string& names) {  // named by the words of `names`
    for (int i = 0; i < DocumentCount; ++i) DocumentTable[i] = DocumentEntry{};
    DocumentCount = 0;
    std::istringstream in(names);
    for (std::string name; in >> name;) DocumentTable[DocumentCount++].Name = name;
  }
  // Docuvane.ini with these [DOC] lines, and a file in doc/ for every name.
  void Setup(const std::string& docLines, const std::vector<std::string>& files) {
    IniFilePath = tex_.Write("Docuvane/Docuvane.ini", "[Setup]\nTrace=0\n[DOC]\n" + docLines);
    for (const std::string& file : files) tex_.Write("doc/" + file, "%PDF");
  }
  testing_support::TempDir tex_;
  testing_support::ScopedEnv texmf_{"TEXMF", tex_.path()};
  std::string saved_ini_ = IniFilePath;
};

TEST_F(CatalogueTest, DocumentsWithDuplicatesGapsAndSearchFlags) {
  tex_.Write("lomari.ini", "[Docuvane.Search]\nP>doc=p\nN>doc=N\n*Star=N\nNoDdf=Y\n");
  for (const char* ddf : {"p.ddf", "n.ddf", "y.ddf", "star.ddf"})
    tex_.Write(std::string("doc/") + ddf, "[Keywords]\n\\x=a\n");
  Setup(
      "Manuals>Guide=guide.pdf\nMANUALS>guide=guide.pdf\nEmpty=\nAbsent=absent.pdf\n"
      "P>doc=p.pdf\nN>doc=n.pdf\nY>doc=y.pdf\n*Star=star.pdf\nNoDdf=noddf.pdf\n",
      {"p.pdf", "n.pdf", "y.pdf", "star.pdf", "noddf.pdf", "guide.pdf"});
  {
    MessageCapture capture;
    Collect_Documents();
    EXPECT_TRUE(capture.messages().empty()) << "empty values and unfound files are silent";
  }
  // Once in place, once started ahead on its own thread and taken over: the
  // same table, and the same messages, written where the collection stands.
  std::vector<std::string> traced[2];
  for (bool ahead : {false, true}) {
    MessageCapture capture;
    TraceMode = 1;
    KeywordListReset(), PoolReset();
    if (ahead) {
      Start_Collect_Documents();
      std::this_thread::sleep_for(std::chrono::milliseconds(50));
    }
    TraceMessage("Collecting now");
    Collect_Documents();  // starts from an empty table
    TraceMode = 0;
    for (const auto& m : capture.messages()) traced[ahead].push_back(m.line());
    // Name, file, search mode, a definition file: the case-folded repeat is not added;
    // flags "p", "N", none ("Y"), a leading "*" over "N", and none without a definition file.
    std::string table;
    for (int i = 0; i < DocumentCount; ++i)
      table += DocumentTable[i].Name + " " + DocumentTable[i].Path.substr(tex_.path().size()) +
               " " + std::to_string(DocumentTable[i].SearchMode) +
               (DocumentTable[i].DefinitionFile.empty() ? "\n" : " ddf\n");
    EXPECT_EQ(table,
              "Manuals>Guide /doc/guide.pdf 0\nP>doc /doc/p.pdf 2 ddf\nN>doc /doc/n.pdf 0 ddf\n"
              "Y>doc /doc/y.pdf 1 ddf\n*Star /doc/star.pdf 2 ddf\nNoDdf /doc/noddf.pdf 0\n");
    EXPECT_EQ(DumpList(), "\\x: a@4 a@3 a@2 a@1\n") << "ahead: " << ahead;
  }
  ASSERT_GT(traced[0].size(), 1u);
  EXPECT_EQ(traced[0].front(), "Docuvane: Collecting now");
  EXPECT_EQ(traced[0], traced[1]);
}

TEST_F(CatalogueTest, LabelsFollowTheIniDocumentsUpToTheTableSize) {
  Setup("D0=d0.pdf\nD1=d1.pdf\nD2=d2.pdf\nD3=d3.pdf\nD4=d4.pdf\n",
        {"d0.pdf", "d1.pdf", "d2.pdf", "d3.pdf", "d4.pdf"});
  std::vector<std::string> labels = {"latex/base/guide.pdf", "win\\dir\\file.pdf",
                                     "deep/" + std::string(300, 'x') + ".pdf"};
  for (int k = 1; k <= kMaxLabels - 3; ++k) labels.push_back("l/" + std::to_string(k));
  ASSERT_EQ(OpenWordIndex(tex_.Write("Update/command.Index", IndexBytes(labels)).c_str()), 1);
  MessageCapture capture;
  Collect_Documents();
  ASSERT_EQ(DocumentCount, kMaxDocuments);
  EXPECT_EQ(DocumentTable[5].Name, "latex>base>guide.pdf");
  EXPECT_EQ(DocumentTable[5].Path, "latex/base/guide.pdf");
  EXPECT_EQ(DocumentTable[6].Name, "win>dir>file.pdf");
  EXPECT_EQ(DocumentTable[7].Name, "l>1") << "a label longer than 255 bytes is skipped";
  EXPECT_EQ(DocumentTable[kMaxDocuments - 1].Path, "l/8185");
  ASSERT_EQ(capture.messages().size(), 2u) << "the full table is reported once";
  EXPECT_TRUE(
      capture.Contains("WARNING: Word index label longer than 255 bytes skipped: deep/xxx"));
  EXPECT_TRUE(capture.Contains("Docuvane: ERROR: Too many documents when try to add: l/8186"));
  EXPECT_EQ(AddDocument("Extra", "f", "/f", "ENG"), -1);
  EXPECT_TRUE(capture.Contains("Docuvane: ERROR: Too many documents when try to add: Extra"));
}

TEST_F(CatalogueTest, OverlongKeyListsAreCutWithAWarning) {
  std::string lines, keys = "[Keywords]\n";  // 40 and 43 bytes a key in the key lists
  for (int i = 1000000; i < 1001000; ++i) {
    lines += "K" + std::to_string(i) + std::string(32, 'k') + "=guide.pdf\n";
    keys += "\\k" + std::string(33, 'x') + std::to_string(i) + "=a\n";
  }
  Setup(lines, {"guide.pdf"});
  const std::string ddf = tex_.Write("doc/big.ddf", keys);
  MessageCapture capture;
  Collect_Documents();
  EXPECT_EQ(DocumentCount, 31998 / 41) << "whole keys only; the cut one finds no value";
  EXPECT_TRUE(capture.Contains("WARNING: [DOC] key list cut at 32000 bytes in " + IniFilePath));
  LoadKeywords(ddf.c_str(), 0);
  const std::string dump = DumpList();
  EXPECT_EQ(std::count(dump.begin(), dump.end(), '\n'), 31998 / 43);
  EXPECT_TRUE(capture.Contains("WARNING: [Keywords] key list cut at 32000 bytes in " + ddf));
}

TEST_F(CatalogueTest, TreeLayoutFollowsTheTwoCachesAndTheChildSearch) {
  const std::string a(200, 'a');
  const std::pair<std::string, std::string> rows[] = {
      // names, outline
      {"A>B>x A>C>y A>B>z", "A(B(x) C(y) B(z))"},        // second level: only the last node cached
      {"A>B>x C>B>y A>B>z", "A(B(x)) C(B(y)) A(B(z))"},  // first level: the same
      {"F>T>c>x F>T>D>y F>T>C>z", "F(T(c(x z) D(y)))"},  // deeper: found among the children
      {"M>y m>x M>L>a m>l>b", "M(y x L(a b))"},          // case ignored, the first text stays
      {"Readme Cat>x", "Readme Cat(x)"},
      {"Cat> Cat>Sub>", "Cat('' Sub(''))"},
      {">x >y", "''(x y)"},  // an emptied cache matches no empty part
      {"M>L>g B>y B>>z", "M(L(g)) B(y ''(z))"},
      {"C>S>" + a + "1>x C>S>" + a + "2>y C>S>" + a + "1>z",  // long parts compared whole
       "C(S(" + a + "1(x z) " + a + "2(y)))"},
  };
  FakeTree tree;  // every row rebuilds the same tree
  for (const auto& [names, outline] : rows) {
    SetDocuments(names);
    EXPECT_EQ(Fill_Tree(tree), 0);
    EXPECT_EQ(FakeTree::Outline(tree.root), outline) << names;
    EXPECT_EQ(tree.GetItemText(DocumentTable[DocumentCount - 1].TreeItem),
              names.substr(names.rfind('>') + 1))
        << names;
  }
}

}  // namespace

namespace {

// The pool's limits and packing, the keys' "#xx" decoding, the definition
// file's name, and the keyword list's order with targets newest first.
TEST_F(CatalogueTest, PoolKeysAndTheKeywordList) {
  MessageCapture messages;
  EXPECT_EQ(PoolAlloc(1, 64001), nullptr);
  EXPECT_EQ(PoolAlloc(0, 24), nullptr);
  EXPECT_TRUE(messages.Contains("PS ERROR: VM Range check in allocation 1 x 64001 = 64001"));
  EXPECT_TRUE(messages.Contains("PS ERROR: VM Range check in allocation 0 x 24 = 0"));
  char* a = static_cast<char*>(PoolAlloc(24, 1));
  EXPECT_EQ(static_cast<char*>(PoolAlloc(24, 1)) - a, 24);
  for (int i = PoolChunkCount(); i < kPoolMaxChunks; ++i) ASSERT_NE(PoolAlloc(1, 64000), nullptr);
  EXPECT_EQ(PoolAlloc(1, 64000), nullptr);
  EXPECT_TRUE(messages.Contains("PS ERROR: VM Memory allocation out VM chunk limit"));
  PoolReset();

  const std::pair<const char*, std::string> keys[] = {
      {"#5Cbegin", "\\begin"}, {"a#4", "a\x04"}, {"x#", "x"}, {"#zz", std::string(1, '\0')}};
  for (const auto& [key, decoded] : keys) {
    char out[64];
    const std::size_t n = DecodeKeyword(key, out, sizeof out);
    EXPECT_EQ(std::string(out, n), decoded) << key;
  }
  const std::pair<const char*, const char*> names[] = {{"guide.pdf", "guide.ddf"},
                                                       {"README", "README.ddf"},
                                                       {"a.b.c", "a.b.ddf"},
                                                       {"tex.v2/README", "tex.v2/README.ddf"}};
  for (const auto& [file, ddf] : names) EXPECT_EQ(DefinitionFileName(file), ddf) << file;

  AddKeywordTarget("Begin", "b1", 0);
  AddKeywordTarget("\\section", "sec:1", 0);
  AddKeywordTarget("begin", "b2", 1);
  AddKeywordTarget("\\section", "sec:2", 1);
  EXPECT_EQ(DumpList(), "\\section: sec:2@1 sec:1@0\nBegin: b2@1 b1@0\n");  // bytes after folding
  EXPECT_EQ(FindKeyword("BEGIN"), KeywordListHead.Next->Next);

  // Keywords in any order (and case) end in one sorted list, each once with
  // all its targets.
  KeywordListReset(), PoolReset();
  std::vector<std::string> words;
  for (int i = 0; i < 3000; ++i) words.push_back("\\w" + std::to_string(i * 7919 % 3000));
  for (int i = 0; i < 3000; i += 3) words.push_back("\\W" + std::to_string(i));
  for (std::size_t i = 0; i < words.size(); ++i) AddKeywordTarget(words[i].c_str(), "a", int(i));
  std::size_t nodes = 0;
  for (const KeywordNode* n = KeywordListHead.Next; n != &KeywordListEnd; n = n->Next, ++nodes) {
    if (n->Next != &KeywordListEnd) {
      ASSERT_LT(CompareIgnoringCase(n->Keyword, n->Next->Keyword), 0);
    }
  }
  EXPECT_EQ(nodes, 3000u);
  const KeywordNode* w0 = FindKeyword("\\w0");
  ASSERT_NE(w0, nullptr);
  EXPECT_EQ(w0->Targets->DocumentIndex, 3000) << "the newest first: \\W0";
  EXPECT_EQ(w0->Targets->Next->DocumentIndex, 0);
}

}  // namespace
