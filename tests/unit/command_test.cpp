// The command line and the command grammar.
#include "command/command.h"

#include <gtest/gtest.h>

#include <clocale>
#include <string>
#include <vector>

#include "catalogue/documents.h"
#include "catalogue/keywords.h"
#include "text/text.h"
#include "base/settings.h"
#include "test_support.h"

namespace {

using testing_support::MessageCapture;

std::string Join(std::vector<std::wstring> args) {
  args.insert(args.begin(), L"docuvane");
  std::vector<const wchar_t*> argv;
  for (const auto& a : args) argv.push_back(a.c_str());
  argv.push_back(nullptr);
  return Command_Line(static_cast<int>(args.size()), argv.data());
}

TEST(CommandLine, JoinsQuotesAndCuts) {
  struct Row {
    const char* what;
    std::vector<std::wstring> args;
    std::string joined;
    bool cut = false;
    const char* locale = "C.UTF-8";
  };
  const Row rows[] = {
      {"no argument gives an empty line", {}, ""},
      {"one word as it is", {L"\\section"}, "\\section"},
      {"only the argument with a blank is quoted", {L"a", L"b c", L"d"}, "a \"b c\" d"},
      {"an empty argument adds only its blank", {L"a", L"", L"b"}, "a  b"},
      {"a tab does not quote", {L"x\ty"}, "x\ty"},
      {"inner quotes are not escaped", {L"say \"hi\""}, "\"say \"hi\"\""},
      {"a leading blank quotes", {L" x"}, "\" x\""},
      {"non-ASCII in the locale's encoding", {L"\u00e9t\u00e9"}, "\xc3\xa9t\xc3\xa9"},
      {"outside the locale: a question mark", {L"a\u4e2db"}, "a?b", false, "C"},
      {"shell characters are plain text", {L"$(rm -rf ~);`x`|&"}, "\"$(rm -rf ~);`x`|&\""},
      {"1023 characters fit", {std::wstring(1023, L'a')}, std::string(1023, 'a')},
      {"1024 characters are cut to 1023", {std::wstring(1024, L'a')}, std::string(1023, 'a'), true},
      {"never cut inside a character",
       {std::wstring(1022, L'a') + L"\u00e9"},
       std::string(1022, 'a'),
       true},
  };
  const std::string old = std::setlocale(LC_CTYPE, nullptr);
  for (const Row& row : rows) {
    ASSERT_NE(std::setlocale(LC_CTYPE, row.locale), nullptr) << row.locale;
    MessageCapture capture;
    EXPECT_EQ(Join(row.args), row.joined) << row.what;
    ASSERT_FALSE(capture.messages().empty()) << row.what;
    EXPECT_EQ(capture.LevelOf("WARNING: Command_Line "), row.cut ? 4 : -1) << row.what;
    EXPECT_EQ(capture.messages().back().line(), "INFO: Command_Line - " + row.joined) << row.what;
    EXPECT_EQ(capture.messages().back().level, 2) << row.what;
  }
  std::setlocale(LC_CTYPE, old.c_str());
}

// Records what ProcessCommand asks of the panel.
class FakePanel : public CommandPanel {
 public:
  bool hasSearch = true;
  bool hasList = true;
  std::vector<std::string> words{"\\Section", "\\section", "\\sectionmark", "{align}"};
  std::vector<std::string> calls;

  bool HasSearchControl() override { return hasSearch; }
  void SetSearchValue(const std::string& text) override { calls.push_back("search:" + text); }
  bool HasWordList() override { return hasList; }
  int FindWord(const char* text, int exact) override {
    calls.push_back("find:" + std::string(text) + "/" + std::to_string(exact));
    const std::string wanted(text);
    if (exact)
      for (std::size_t i = 0; i < words.size(); ++i)
        if (words[i] == wanted) return static_cast<int>(i);
    for (std::size_t i = 0; i < words.size(); ++i)
      if (CompareIgnoringCase(words[i].substr(0, wanted.size()).c_str(), text) == 0)
        return static_cast<int>(i);
    return -1;
  }
  void SelectWord(int row) override { calls.push_back("select:" + std::to_string(row)); }
  std::string GetWord(int row) override { return words.at(static_cast<std::size_t>(row)); }
  void ShowTopic(const char* word, int openIfSingle) override {
    calls.push_back("show:" + std::string(word) + "/" + std::to_string(openIfSingle));
  }
  int OpenDocument(const char* path, const char* anchor) override {
    calls.push_back("open:" + std::string(path) + "#" + anchor);
    return 1;
  }
};

class ProcessCommandTest : public ::testing::Test {
 protected:
  void SetUp() override {
    TraceMode = 0;
    KeywordListReset();
    DocumentCount = 2;
    DocumentTable[0].Path = "lomari/help.pdf";
    DocumentTable[1].Path = "lomari/help-new.pdf";
    // Registered first: the target a topic opens.
    AddKeywordTarget(".LMR.Help", "first", 0);
    AddKeywordTarget(".LMR.Help", "second", 1);
    AddKeywordTarget(".LMR.Broken", "nowhere", 9999);
  }
  void TearDown() override {
    KeywordListReset();
    DocumentCount = savedCount_;
    TraceMode = savedTrace_;
  }
  const int savedCount_ = DocumentCount, savedTrace_ = TraceMode;
};

// The calls of a word search: selecting list row `row` (none when -1) and
// showing `shown` (the word itself when empty).
std::vector<std::string> Search(const std::string& word, int row = -1, std::string shown = "") {
  std::vector<std::string> calls = {"search:" + word, "find:" + word + "/1"};
  if (row >= 0) calls.push_back("select:" + std::to_string(row));
  calls.push_back("show:" + (shown.empty() ? word : shown) + "/1");
  return calls;
}

TEST_F(ProcessCommandTest, Grammar) {
  const std::string help = "open:lomari/help.pdf#first";
  struct Row {
    const char* what;
    std::string command;
    std::vector<std::string> calls;
  };
  const std::vector<Row> rows = {
      {"a topic opens its first-registered target and nothing else", ".LMR.Help", {help}},
      {"topics match ignoring case", ".lmr.HELP", {help}},
      {"a hash mark is dropped", "#.LMR.Help", {help}},
      {"question mark then hash mark: both dropped", "?#.LMR.Help", {help}},
      {"question mark alone before a topic", "?.LMR.Help", {help}},
      {"hash mark then question mark keeps the question mark", "#?.LMR.Help", Search("?.LMR.Help")},
      {"an unknown topic is looked up as a word, dot included", ".LMR.Nothing",
       Search(".LMR.Nothing")},
      {"a topic naming no document falls through to the words", ".LMR.Broken",
       Search(".LMR.Broken")},
      {"an exact word wins over an earlier prefix match", "\\section", Search("\\section", 1)},
      {"a prefix shows the listed word", "\\sectionm", Search("\\sectionm", 2, "\\sectionmark")},
      {"only a question mark searches the empty text", "?", Search("", 0, "\\Section")},
      {"a question mark and hash mark alone", "?#", Search("", 0, "\\Section")},
      {"empty command does nothing", "", {}},
      {"quotes stay part of the body", "\"b c\"", Search("\"b c\"")},
      {"shell characters are a word like any other", "$(touch x);`id`", Search("$(touch x);`id`")},
      {"invalid UTF-8 passes as bytes", "\xff\xfe\x80", Search("\xff\xfe\x80")},
      {"10,000 characters", std::string(10000, 'w'), Search(std::string(10000, 'w'))},
  };
  for (const Row& row : rows) {
    FakePanel panel;
    EXPECT_EQ(ProcessCommand(panel, row.command.c_str(), 1), 1) << row.what;
    EXPECT_EQ(panel.calls, row.calls) << row.what;
  }
}

TEST_F(ProcessCommandTest, MissingControlsNullCommandAndTraces) {
  FakePanel bare;
  bare.hasSearch = bare.hasList = false;
  ProcessCommand(bare, "\\section", 1);
  EXPECT_EQ(bare.calls, std::vector<std::string>{"show:\\section/1"});
  FakePanel panel;
  EXPECT_EQ(ProcessCommand(panel, nullptr, 1), 1);
  EXPECT_TRUE(panel.calls.empty());
  ProcessCommand(panel, "\\section", 0);
  EXPECT_EQ(panel.calls[1], "find:\\section/0");
  EXPECT_EQ(panel.calls[2], "select:0");  // the first prefix match ignoring case

  // The keyword trace shows what follows the question mark; received
  // commands are traced only in trace mode.
  for (const int mode : {0, 1}) {
    TraceMode = mode;
    MessageCapture capture;
    ProcessCommand(panel, "?#x", 1);
    EXPECT_TRUE(capture.Contains("Search Keyword: #x")) << mode;
    EXPECT_EQ(capture.Contains("Received Command: ?#x"), mode == 1) << mode;
  }
}

}  // namespace
