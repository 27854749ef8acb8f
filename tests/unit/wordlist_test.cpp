// The word list: loading, skipping '@' words, order and prefix search.
#include "wordindex/wordlist.h"

#include <gtest/gtest.h>

#include <sstream>
#include <string>
#include <vector>

#include "test_support.h"
#include "wordindex/index_writer.h"
#include "wordindex/wordindex.h"

using testing_support::MessageCapture;

namespace {

void OpenListing(const std::string& listing) {
  WordIndexBuilder builder;
  std::istringstream in(listing);
  std::string error;
  ASSERT_TRUE(builder.AddListing(in, error)) << error;
  std::vector<uint8_t> bytes;
  ASSERT_TRUE(builder.Build(WordIndexBuilder::Form::Compact, bytes, error)) << error;
  ASSERT_EQ(OpenWordIndexFromMemory(bytes.data(), bytes.size(), "list.Index"), 1);
}

std::vector<std::string> Strings(const WordListData& data) {
  return std::vector<std::string>(data.Words.begin(), data.Words.end());
}

class WordListTest : public ::testing::Test {
 protected:
  void TearDown() override { CloseWordIndex(); }
  MessageCapture messages;
};

TEST_F(WordListTest, FillsSkipsAtWordsCountsAndSorts) {
  OpenListing(
      "{align}\ta.pdf\t1\nAlpha\ta.pdf\t1\n\\alpha\ta.pdf\t1\n\\@ifnextchar\ta.pdf\t1\n"
      "\\section\ta.pdf\t1\nzeta@\ta.pdf\t1\n{tabular}\ta.pdf\t1\n\\Beta\ta.pdf\t1\n"
      "\\\\\ta.pdf\t1\n{\ta.pdf\t1\n");
  const int commands = CommandWordCount;
  const int environments = EnvironmentWordCount;
  WordListData data;
  ASSERT_EQ(Fill_WordIndex(data), 1);
  EXPECT_EQ(CommandWordCount - commands, 4);  // \alpha \section \Beta "\\"
  EXPECT_EQ(EnvironmentWordCount - environments, 3);
  EXPECT_TRUE(messages.Contains("Skipped index word: \\@ifnextchar"));
  EXPECT_TRUE(messages.Contains("Skipped index word: zeta@"));
  EXPECT_TRUE(messages.Contains("QListBox::Fill_WordIndex Time: "));
  EXPECT_TRUE(messages.Contains(" ms"));
  // The '@' word is still in the file for lookups.
  EXPECT_NE(FindIndexWord("\\@ifnextchar"), 0);

  std::vector<std::string> words = Strings(data);
  ASSERT_EQ(words.size(), 8u);
  // "{" and "\\" compare as "" and "\"; Alpha and \alpha are equal, either order.
  EXPECT_EQ(words[0], "{");
  EXPECT_EQ(words[1], "\\\\");
  EXPECT_EQ(words[2], "{align}");
  EXPECT_TRUE((words[3] == "Alpha" && words[4] == "\\alpha") ||
              (words[3] == "\\alpha" && words[4] == "Alpha"));
  EXPECT_EQ(words[5], "\\Beta");
  EXPECT_EQ(words[6], "\\section");
  EXPECT_EQ(words[7], "{tabular}");
}

TEST_F(WordListTest, NoIndexGivesAnEmptyListAndNoTiming) {
  CloseWordIndex();
  const int commands = CommandWordCount;
  WordListData data;
  EXPECT_EQ(Fill_WordIndex(data), 0);
  EXPECT_TRUE(data.Words.empty());
  EXPECT_EQ(CommandWordCount, commands);
  EXPECT_FALSE(messages.Contains("Fill_WordIndex Time"));
}

TEST(CompareIndexWordsTest, IgnoresOneLeadingMarkAndCase) {
  struct Row {
    const char* a;
    const char* b;
    int sign;
  };
  const Row rows[] = {
      {"{align}", "\\alpha", -1},  // align} < alpha
      {"\\alpha", "Alpha", 0},
      {"\\\\x", "\\x", -1},  // only one mark dropped
      {"{{a", "a", 1},
      {"Zeta", "alpha", 1},
      {"a", "ab", -1},
      {"\xE9", "z", 1},  // unsigned bytes
      {"[", "a", -1},    // '[' sorts before folded letters
  };
  for (const Row& row : rows) {
    const int got = CompareIndexWords(row.a, row.b);
    EXPECT_EQ((got > 0) - (got < 0), row.sign) << row.a << " vs " << row.b;
  }
}

TEST(FindWordInListTest, PrefixAndExactSearch) {
  const std::vector<const char*> words = {"{align}",   "\\alpha",   "\\Section", "\\section",
                                          "sectional", "{section}", "sec"};
  struct Row {
    const char* text;
    int exact;
    int row;
    const char* why;
  };
  const Row rows[] = {
      {"", 0, 0, "empty text gives the first row"},
      {"sec", 0, 2, "marks of the words are looked through"},
      {"SEC", 0, 2, "prefix ignores case"},
      {"\\sec", 0, 2, "a backslash text matches only backslash words"},
      {"{sec", 0, 5, "a brace text matches only brace words"},
      {"section", 1, 3, "exact match wins, case included"},
      {"sectio", 1, 2, "no exact match: first word starting with the text"},
      {"sec", 1, 6, "exact match after other prefixes"},
      {"\\Section", 1, 2, "exact with the mark"},
      {"{align", 1, 0, "prefix fallback with exact set"},
      {"beta", 0, -1, "nothing starts with it"},
      {"beta", 1, -1, "nothing starts with it, exact"},
      {"alpha}", 0, -1, "longer than every word"},
  };
  for (const Row& row : rows)
    EXPECT_EQ(FindWordInList(words, row.text, row.exact), row.row) << row.why << ": " << row.text;
  EXPECT_EQ(FindWordInList({}, "", 0), -1);
}

}  // namespace
