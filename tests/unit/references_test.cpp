// Keyword targets of a word as Locations items.
#include "wordindex/references.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "catalogue/documents.h"
#include "catalogue/keywords.h"
#include "test_support.h"

namespace {

class KeywordTargetsTest : public ::testing::Test {
 protected:
  void SetUp() override {
    KeywordListReset();
    savedCount_ = DocumentCount;
    for (int i = 0; i < 3; ++i) saved_[i] = DocumentTable[i];
    DocumentTable[0].Path = "/tex/doc/usrguide.pdf";
    DocumentTable[1].Path = "/tex/doc/amsldoc.pdf";
    DocumentTable[2].Path = "/tex/doc/" + std::string(100, 'x') + ".pdf";
    DocumentCount = 3;
  }
  void TearDown() override {
    KeywordListReset();
    for (int i = 0; i < 3; ++i) DocumentTable[i] = saved_[i];
    DocumentCount = savedCount_;
  }

 private:
  int savedCount_ = 0;
  DocumentEntry saved_[3];
};

TEST_F(KeywordTargetsTest, ItemsNewestFirstWithTheSingleTarget) {
  AddKeywordTarget("\\section", "sec:1", 0);  // t1
  AddKeywordTarget("\\section", "sec:2", 1);  // t2
  AddKeywordTarget("{align}", "eq", 1);
  AddKeywordTarget("\\bad", "gone", 7);  // no such document
  AddKeywordTarget("\\bad", "kept", 0);
  AddKeywordTarget("\\long", std::string(20, 'a').c_str(), 2);  // 134 characters
  AddKeywordTarget("\\fits", std::string(13, 'a').c_str(), 2);  // 127 characters
  struct Row {
    const char* word;
    std::vector<std::string> items;
    bool single;
  };
  const Row rows[] = {
      {"\\section", {"/tex/doc/amsldoc.pdf#sec:2", "/tex/doc/usrguide.pdf#sec:1"}, false},
      {"\\SECTION", {"/tex/doc/amsldoc.pdf#sec:2", "/tex/doc/usrguide.pdf#sec:1"}, false},
      {"{ALIGN}", {"/tex/doc/amsldoc.pdf#eq"}, true},
      {"\\bad", {"/tex/doc/usrguide.pdf#kept"}, false},
      {"\\long", {}, false},
      {"\\fits", {DocumentTable[2].Path + "#" + std::string(13, 'a')}, true},
      {"\\sec", {}, false},
      {"", {}, false},
  };
  testing_support::MessageCapture messages;
  for (const Row& row : rows) {
    KeywordTargets targets = CollectKeywordTargets(row.word);
    EXPECT_EQ(targets.items, row.items) << row.word;
    EXPECT_EQ(targets.single, row.single) << row.word;
  }
  EXPECT_TRUE(messages.Contains("Keyword target too long"));
  KeywordTargets single = CollectKeywordTargets("{align}");
  EXPECT_EQ(single.singlePath, "/tex/doc/amsldoc.pdf");
  EXPECT_EQ(single.singleAnchor, "eq");
}

}  // namespace
