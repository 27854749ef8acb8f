// The command line and the command grammar.
#include "command/command.h"

#include <gtest/gtest.h>

#include <clocale>
#include <string>
#include <vector>

#include "catalogue/documents.h"
#include "catalogue/keywords.h"
#include "shell/settings.h"
#include "test_support.h"

namespace {

using testing_support::MessageCapture;

// Runs with a UTF-8 character type, as the program does under a desktop.
class Utf8Locale {
 public:
  Utf8Locale() : old_(std::setlocale(LC_CTYPE, nullptr)) {
    if (std::setlocale(LC_CTYPE, "C.UTF-8") == nullptr) std::setlocale(LC_CTYPE, "en_US.UTF-8");
  }
  ~Utf8Locale() { std::setlocale(LC_CTYPE, old_.c_str()); }

 private:
  std::string old_;
};

std::string Join(std::vector<std::wstring> args) {
  args.insert(args.begin(), L"docuvane");
  std::vector<const wchar_t*> argv;
  for (const auto& a : args) argv.push_back(a.c_str());
  argv.push_back(nullptr);
  return Command_Line(static_cast<int>(args.size()), argv.data());
}

TEST(CommandLine, JoinsAndQuotesOnlyArgumentsWithBlanks) {
  Utf8Locale utf8;
  struct Row {
    const char* what;
    std::vector<std::wstring> args;
    std::string joined;
  };
  const Row rows[] = {
      {"no argument gives an empty line", {}, ""},
      {"one word as it is", {L"\\section"}, "\\section"},
      {"only the argument with a blank is quoted", {L"a", L"b c", L"d"}, "a \"b c\" d"},
      {"an empty argument adds only its blank", {L"a", L"", L"b"}, "a  b"},
      {"an empty argument alone", {L""}, ""},
      {"a tab does not quote", {L"x\ty"}, "x\ty"},
      {"inner quotes are not escaped", {L"say \"hi\""}, "\"say \"hi\"\""},
      {"a leading blank quotes", {L" x"}, "\" x\""},
      {"non-ASCII in the locale's encoding", {L"\u00e9t\u00e9"}, "\xc3\xa9t\xc3\xa9"},
      {"shell characters are plain text", {L"$(rm -rf ~);`x`|&"}, "\"$(rm -rf ~);`x`|&\""},
  };
  for (const Row& row : rows) {
    MessageCapture capture;
    EXPECT_EQ(Join(row.args), row.joined) << row.what;
    ASSERT_EQ(capture.messages().size(), 1u) << row.what;
    EXPECT_EQ(capture.messages()[0].line(), "INFO: Command_Line - " + row.joined) << row.what;
    EXPECT_EQ(capture.messages()[0].level, 2) << row.what;
  }
}

TEST(CommandLine, CharacterOutsideTheLocaleBecomesQuestionMark) {
  const std::string old = std::setlocale(LC_CTYPE, nullptr);
  std::setlocale(LC_CTYPE, "C");
  EXPECT_EQ(Join({L"a\u4e2db"}), "a?b");
  std::setlocale(LC_CTYPE, old.c_str());
}

TEST(CommandLine, OverlongLineIsCutWithWarning) {
  Utf8Locale utf8;
  struct Row {
    const char* what;
    std::wstring arg;
    std::size_t length;
    bool warned;
  };
  const Row rows[] = {
      {"1023 characters fit", std::wstring(1023, L'a'), 1023, false},
      {"1024 characters are cut to 1023", std::wstring(1024, L'a'), 1023, true},
      {"10,000 characters are cut to 1023", std::wstring(10000, L'x'), 1023, true},
      // 1022 ASCII bytes and a two-byte character: the character is dropped whole.
      {"never cut inside a character", std::wstring(1022, L'a') + L"\u00e9", 1022, true},
  };
  for (const Row& row : rows) {
    MessageCapture capture;
    const std::string line = Join({row.arg});
    EXPECT_EQ(line.size(), row.length) << row.what;
    EXPECT_EQ(capture.LevelOf("WARNING: Command_Line "), row.warned ? 4 : -1) << row.what;
    EXPECT_TRUE(capture.Contains("INFO: Command_Line - ")) << row.what;
  }
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
    savedCount_ = DocumentCount;
    savedTrace_ = TraceMode;
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

 private:
  int savedCount_ = 0;
  int savedTrace_ = 0;
};

TEST_F(ProcessCommandTest, GrammarTable) {
  const std::string help = "open:lomari/help.pdf#first";
  const std::string longWord(10000, 'w');
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
      {"hash mark then question mark keeps the question mark",
       "#?.LMR.Help",
       {"search:?.LMR.Help", "find:?.LMR.Help/1", "show:?.LMR.Help/1"}},
      {"an unknown topic is looked up as a word, dot included",
       ".LMR.Nothing",
       {"search:.LMR.Nothing", "find:.LMR.Nothing/1", "show:.LMR.Nothing/1"}},
      {"a topic naming no document falls through to the word search",
       ".LMR.Broken",
       {"search:.LMR.Broken", "find:.LMR.Broken/1", "show:.LMR.Broken/1"}},
      {"an exact word wins over an earlier prefix match",
       "\\section",
       {"search:\\section", "find:\\section/1", "select:1", "show:\\section/1"}},
      {"a prefix shows the listed word",
       "\\sectionm",
       {"search:\\sectionm", "find:\\sectionm/1", "select:2", "show:\\sectionmark/1"}},
      {"only a question mark searches the empty text",
       "?",
       {"search:", "find:/1", "select:0", "show:\\Section/1"}},
      {"a question mark and hash mark alone",
       "?#",
       {"search:", "find:/1", "select:0", "show:\\Section/1"}},
      {"empty command does nothing", "", {}},
      {"quotes stay part of the body",
       "\"b c\"",
       {"search:\"b c\"", "find:\"b c\"/1", "show:\"b c\"/1"}},
      {"shell characters are a word like any other",
       "$(touch x);`id`",
       {"search:$(touch x);`id`", "find:$(touch x);`id`/1", "show:$(touch x);`id`/1"}},
      {"invalid UTF-8 passes as bytes",
       "\xff\xfe\x80",
       {"search:\xff\xfe\x80", "find:\xff\xfe\x80/1", "show:\xff\xfe\x80/1"}},
      {"10,000 characters",
       longWord,
       {"search:" + longWord, "find:" + longWord + "/1", "show:" + longWord + "/1"}},
  };
  for (const Row& row : rows) {
    FakePanel panel;
    EXPECT_EQ(ProcessCommand(panel, row.command.c_str(), 1), 1) << row.what;
    EXPECT_EQ(panel.calls, row.calls) << row.what;
  }
}

TEST_F(ProcessCommandTest, MissingControlsAndNullCommand) {
  FakePanel bare;
  bare.hasSearch = false;
  bare.hasList = false;
  ProcessCommand(bare, "\\section", 1);
  EXPECT_EQ(bare.calls, std::vector<std::string>{"show:\\section/1"});

  FakePanel panel;
  EXPECT_EQ(ProcessCommand(panel, nullptr, 1), 1);
  EXPECT_TRUE(panel.calls.empty());

  FakePanel inexact;
  ProcessCommand(inexact, "\\section", 0);
  EXPECT_EQ(inexact.calls[1], "find:\\section/0");
  EXPECT_EQ(inexact.calls[2], "select:0");  // the first prefix match ignoring case
}

TEST_F(ProcessCommandTest, Traces) {
  struct Row {
    const char* what;
    int traceMode;
    const char* command;
    const char* received;  // NULL: no "Received Command: " trace
    const char* keyword;   // NULL: no "Search Keyword: " trace
  };
  const Row rows[] = {
      {"the keyword trace shows what follows the question mark", 0, "?#x", nullptr,
       "Search Keyword: #x"},
      {"received commands are traced only in trace mode", 1, "?#x", "Received Command: ?#x",
       "Search Keyword: #x"},
      {"an empty command gets only the optional trace", 1, "", "Received Command: ", nullptr},
  };
  for (const Row& row : rows) {
    TraceMode = row.traceMode;
    MessageCapture capture;
    FakePanel panel;
    ProcessCommand(panel, row.command, 1);
    EXPECT_EQ(capture.Contains("Received Command: "), row.received != nullptr) << row.what;
    if (row.received) {
      EXPECT_TRUE(capture.Contains(row.received)) << row.what;
    }
    EXPECT_EQ(capture.Contains("Search Keyword: "), row.keyword != nullptr) << row.what;
    if (row.keyword) {
      EXPECT_TRUE(capture.Contains(row.keyword)) << row.what;
    }
  }
}

}  // namespace
