// Finding command.Index in the TeX trees.
#include "wordindex/locate.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <string>

#include "test_support.h"

using testing_support::MessageCapture;
using testing_support::ScopedEnv;
using testing_support::TempDir;

namespace {

TEST(LocateWordIndexTest, UpdateFirstThenDocumentation) {
  struct Row {
    const char* what;
    bool inUpdate;
    bool inDoc;
    const char* expectedTail;  // nullptr: not found
  };
  const Row rows[] = {
      {"both places: the update files win", true, true, "/Update/command.Index"},
      {"only in the documentation", false, true, "/doc/latex/command.Index"},
      {"nowhere", false, false, nullptr},
  };
  for (const Row& row : rows) {
    TempDir tree;
    if (row.inUpdate) tree.Write("Update/command.Index", "WX");
    if (row.inDoc) tree.Write("doc/latex/command.Index", "WX");
    tree.Write("doc/other.pdf", "");
    ScopedEnv texmf("TEXMF", tree.path());
    ScopedEnv texdir("TEXDIR", std::nullopt);
    MessageCapture messages;
    WordIndexPath.clear();
    const std::string& found = LocateWordIndex();
    if (row.expectedTail) {
      EXPECT_EQ(found, tree.path() + row.expectedTail) << row.what;
      EXPECT_TRUE(messages.Contains("Document Word Index File: " + found)) << row.what;
    } else {
      EXPECT_EQ(found, "") << row.what;
      EXPECT_TRUE(messages.Contains("Document Word Index File: NOT FOUND")) << row.what;
    }
  }
  WordIndexPath.clear();
}

TEST(LocateWordIndexTest, KeepsAFoundPathAndSearchesAgainAfterAMiss) {
  TempDir tree;
  ScopedEnv texmf("TEXMF", tree.path());
  WordIndexPath.clear();
  EXPECT_EQ(LocateWordIndex(), "");
  const std::string path = tree.Write("Update/command.Index", "WX");
  ScopedEnv refresh("TEXDIR", tree.path());  // forgets the search caches
  EXPECT_EQ(LocateWordIndex(), path);
  std::filesystem::remove(path);
  EXPECT_EQ(LocateWordIndex(), path);
  WordIndexPath.clear();
}

TEST(LocateWordIndexTest, RefusesPathsOf256BytesOrMore) {
  TempDir tree;
  // Directories deep enough that the full path passes 255 bytes.
  std::string rel = "Update/";
  while (tree.path().size() + rel.size() + 14 < 256) rel = std::string(40, 'd') + "/" + rel;
  ScopedEnv texmf("TEXMF", tree.path() + "/" + rel.substr(0, rel.size() - 7));
  tree.Write(rel + "command.Index", "WX");
  ScopedEnv texdir("TEXDIR", std::nullopt);
  MessageCapture messages;
  WordIndexPath.clear();
  EXPECT_EQ(LocateWordIndex(), "");
  EXPECT_TRUE(messages.Contains("ERROR: Word Index file path too long: "));
}

}  // namespace
