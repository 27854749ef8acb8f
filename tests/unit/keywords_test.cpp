#include "catalogue/keywords.h"

#include <gtest/gtest.h>

#include <string>
#include <utility>
#include <vector>

#include "catalogue/documents.h"
#include "catalogue/pool.h"
#include "platform/profile.h"
#include "shell/settings.h"
#include "test_support.h"

namespace {

using testing_support::MessageCapture;
using testing_support::ScopedEnv;
using testing_support::TempDir;

// (keyword, anchors newest first) for every node after the head.
using ListDump = std::vector<std::pair<std::string, std::vector<std::string>>>;

std::vector<std::string> Anchors(const KeywordNode& node) {
  std::vector<std::string> anchors;
  for (const KeywordTarget* t = node.Targets; t != nullptr; t = t->Next) anchors.push_back(t->Anchor);
  return anchors;
}

ListDump DumpList() {
  ListDump dump;
  for (const KeywordNode* n = KeywordListHead.Next; n != &KeywordListEnd; n = n->Next)
    dump.emplace_back(n->Keyword, Anchors(*n));
  return dump;
}

class KeywordTest : public ::testing::Test {
 protected:
  void SetUp() override {
    KeywordListReset();
    PoolReset();
    ProfileCacheClear();
    DocumentCount = 0;
    saved_trace_mode_ = TraceMode;
    TraceMode = 0;
  }
  void TearDown() override {
    KeywordListReset();
    PoolReset();
    for (int i = 0; i < DocumentCount; ++i) DocumentTable[i] = DocumentEntry{};
    DocumentCount = 0;
    TraceMode = saved_trace_mode_;
  }
  int saved_trace_mode_ = 0;
};

TEST(DecodeKeywordTest, EscapesAndLimits) {
  struct Row {
    const char* what;
    std::string key;
    std::string decoded;
  };
  const Row rows[] = {
      {"escaped backslash", "#5Cbegin", "\\begin"},
      {"lower-case hex digits", "#5c#7b", "\\{"},
      {"one character after # at the end", "a#4", std::string("a\x04", 2)},
      {"lone # at the end is dropped", "x#", "x"},
      {"non-hex digits count as 0", "#zz", std::string(1, '\0')},
      {"non-hex first digit", "#g5", std::string("\x05", 1)},
      {"# escapes the next # too", "##41", std::string("\x04" "1", 2)},
      {"plain text unchanged", "\\section", "\\section"},
      {"empty key", "", ""},
      {"overlong key is cut to 63 bytes", std::string(70, 'k'), std::string(63, 'k')},
      {"escape at the cut is not split", std::string(62, 'k') + "#41#42", std::string(62, 'k') + "A"},
  };
  for (const Row& row : rows) {
    char out[64];
    out[63] = '\x7f';
    const std::size_t n = DecodeKeyword(row.key.c_str(), out, sizeof out);
    EXPECT_EQ(std::string(out, n), row.decoded) << row.what;
    EXPECT_EQ(out[n], '\0') << row.what;
  }
  char tiny[1] = {'x'};
  EXPECT_EQ(DecodeKeyword("abc", tiny, 1), 0u);
  EXPECT_EQ(tiny[0], '\0');
}

TEST(CompareIgnoringCaseTest, FoldsToLowerThenUnsignedBytes) {
  struct Row {
    const char* a;
    const char* b;
    int sign;
  };
  const Row rows[] = {
      {"Begin", "begin", 0},
      {"alpha", "Beta", -1},
      {"[", "A", -1},   // '[' sorts before 'a', though after 'A'
      {"_", "z", -1},
      {"z", "\xe9", -1},  // bytes above 127 sort last
      {"abc", "ab", 1},
      {"", "a", -1},
  };
  for (const Row& row : rows) {
    const int r = CompareIgnoringCase(row.a, row.b);
    EXPECT_EQ((r > 0) - (r < 0), row.sign) << row.a << " vs " << row.b;
  }
}

TEST(DefinitionFileNameTest, CutsAtTheLastDotOfTheFileName) {
  struct Row {
    std::string file;
    std::string ddf;
  };
  const Row rows[] = {
      {"guide.pdf", "guide.ddf"},
      {"README", "README.ddf"},
      {"a.b.c", "a.b.ddf"},
      {"latex/base/guide.pdf", "latex/base/guide.ddf"},
      {"tex.v2/README", "tex.v2/README.ddf"},  // a dot in a directory is no extension
      {std::string(130, 'n') + ".pdf", std::string(127, 'n') + ".ddf"},
  };
  for (const Row& row : rows) EXPECT_EQ(DefinitionFileName(row.file.c_str()), row.ddf) << row.file;
}

TEST_F(KeywordTest, ListIsSortedIgnoringCaseAndTargetsRunNewestFirst) {
  AddKeywordTarget("\\section", "s1", 0);
  AddKeywordTarget("\\Begin", "b1", 0);
  AddKeywordTarget("\\alpha", "a1", 1);
  AddKeywordTarget("\\begin", "b2", 1);  // shares the node, keeps "\Begin"
  AddKeywordTarget("\\zeta", "z1", 2);
  AddKeywordTarget("\\section", "s2", 2);
  const ListDump expected = {
      {"\\alpha", {"a1"}},
      {"\\Begin", {"b2", "b1"}},
      {"\\section", {"s2", "s1"}},
      {"\\zeta", {"z1"}},
  };
  EXPECT_EQ(DumpList(), expected);
  EXPECT_EQ(KeywordListHead.Next->Next->Targets->DocumentIndex, 1);
  EXPECT_EQ(KeywordListHead.Next->Next->Targets->Next->DocumentIndex, 0);
}

TEST_F(KeywordTest, EmptyKeywordLandsOnTheHead) {
  AddKeywordTarget("\\a", "x", 0);
  AddKeywordTarget("", "lost", 0);
  ASSERT_NE(KeywordListHead.Targets, nullptr);
  EXPECT_STREQ(KeywordListHead.Targets->Anchor, "lost");
  const ListDump expected = {{"\\a", {"x"}}};
  EXPECT_EQ(DumpList(), expected);
}

TEST_F(KeywordTest, PoolExhaustionSkipsKeywordsWithoutBreakingTheList) {
  AddKeywordTarget("\\kept", "k", 0);
  while (PoolChunkCount() < kPoolMaxChunks) ASSERT_NE(PoolAlloc(1, 64000), nullptr);
  while (PoolAlloc(1, 8) != nullptr) {
  }
  MessageCapture capture;
  AddKeywordTarget("\\new", "n", 0);
  AddKeywordTarget("\\kept", "k2", 0);
  EXPECT_TRUE(capture.Contains("PS ERROR: VM Memory allocation out VM chunk limit"));
  const ListDump expected = {{"\\kept", {"k"}}};
  EXPECT_EQ(DumpList(), expected);
}

TEST_F(KeywordTest, DefinitionFileLoadsItsKeywords) {
  TempDir tex;
  tex.Write("doc/latex/guide.pdf", "%PDF");
  const std::string ddf = tex.Write("doc/latex/guide.ddf",
                                    "[Keywords]\n"
                                    "\\section=sec:1#sec:2\n"
                                    "\\label=\n"
                                    "#5Cbegin=env:begin\n"
                                    "\\split=a##b#\n"
                                    "\\cut=" + std::string(200, 'v') + "\n"
                                    "\\" + std::string(70, 'L') + "=too-long\n"
                                    "[Other]\n\\ignored=x\n");
  tex.Write("doc/empty.ddf", "[Keywords]\n[More]\nx=y\n");
  ScopedEnv texmf("TEXMF", tex.path());

  DocumentCount = 3;
  DocumentTable[0].FileName = "guide.pdf";
  DocumentTable[1].FileName = "empty.pdf";
  DocumentTable[2].FileName = "nothing.pdf";
  TraceMode = 1;
  MessageCapture capture;

  EXPECT_EQ(Load_Document_Index(0, 1), 1);
  EXPECT_EQ(DocumentTable[0].DefinitionFile, ddf);
  EXPECT_EQ(Load_Document_Index(1, 1), 0) << "no keys in [Keywords]";
  EXPECT_EQ(DocumentTable[1].DefinitionFile, "");
  EXPECT_EQ(Load_Document_Index(2, 1), 0) << "no definition file";

  const ListDump expected = {
      {"\\begin", {"env:begin"}},
      {"\\cut", {std::string(127, 'v')}},
      {"\\label", {"\\label"}},
      {"\\section", {"sec:2", "sec:1"}},
      {"\\split", {"", "b", "", "a"}},
  };
  EXPECT_EQ(DumpList(), expected);
  EXPECT_TRUE(capture.Contains("Docuvane: INFO: Load_Document_Index - guide.pdf"));
  EXPECT_TRUE(capture.Contains("Docuvane: Loads Keys from file: " + ddf));
  EXPECT_TRUE(capture.Contains("WARNING: Keyword longer than 63 bytes skipped: \\LLL"));
}

TEST_F(KeywordTest, OverlongKeyListIsCutWithAWarning) {
  TempDir tex;
  std::string ddf = "[Keywords]\n";
  for (int i = 0; i < 1000; ++i) ddf += "\\k" + std::string(36, 'x') + std::to_string(1000 + i) + "=a\n";
  const std::string path = tex.Write("doc/big.ddf", ddf);
  MessageCapture capture;
  LoadKeywords(path.c_str(), 0);
  EXPECT_TRUE(capture.Contains("WARNING: [Keywords] key list cut at 32000 bytes in " + path));
  EXPECT_EQ(DumpList().size(), 31998u / 43) << "whole keys only, the cut one left out";
}

}  // namespace
