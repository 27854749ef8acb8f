// The command grammar.
#include "command/command.h"

#include <gtest/gtest.h>

#include <clocale>

#include "catalogue/documents.h"
#include "catalogue/keywords.h"
#include "test_support.h"
#include "wordindex/wordlist.h"

namespace {

using testing_support::MessageCapture;
using Calls = std::vector<std::string>;

// Records what ProcessCommand asks of the panel.
class FakePanel : public CommandPanel {
 public:
  bool controls = true;
  std::vector<const char*> words{"\\Section", "\\section", "\\sectionmark", "{align}"};
  Calls calls;
  bool HasSearchControl() override { return controls; }
  bool HasWordList() override { return controls; }
  void SetSearchValue(const std::string& text) override { calls.push_back("search:" + text); }
  int FindWord(const char* text, int exact) override {
    calls.push_back("find:" + std::string(text) + "/" + std::to_string(exact));
    return FindWordInList(words, text, exact);
  }
  void SelectWord(int row) override { calls.push_back("select:" + std::to_string(row)); }
  std::string GetWord(int row) override { return words.at(static_cast<std::size_t>(row)); }
  void ShowTopic(const char* word, int open) override {
    calls.push_back("show:" + std::string(word) + "/" + std::to_string(open));
  }
  int OpenDocument(const char* path, const char* anchor) override {
    calls.push_back("open:" + std::string(path) + "#" + anchor);
    return 1;
  }
};

// The calls of a word search selecting list row `row` (none when -1) and
// showing `shown` (the word itself when empty).
Calls Search(const std::string& word, int row = -1, std::string shown = "") {
  Calls calls = {"search:" + word, "find:" + word + "/1"};
  if (row >= 0) calls.push_back("select:" + std::to_string(row));
  calls.push_back("show:" + (shown.empty() ? word : shown) + "/1");
  return calls;
}

TEST(ProcessCommand, GrammarAndMissingControls) {
  const int savedCount = DocumentCount;
  KeywordListReset();
  DocumentCount = 2;
  DocumentTable[0].Path = "lomari/help.pdf";
  DocumentTable[1].Path = "lomari/help-new.pdf";
  AddKeywordTarget(".LMR.Help", "first", 0);  // registered first: the target a topic opens
  AddKeywordTarget(".LMR.Help", "second", 1);
  AddKeywordTarget(".LMR.Broken", "nowhere", 9999);
  const Calls help = {"open:lomari/help.pdf#first"};
  const std::pair<std::string, Calls> rows[] = {
      {".LMR.Help", help},
      {"#.LMR.Help", help},
      {"?#.LMR.Help", help},
      {"#?.LMR.Help", Search("?.LMR.Help")},   // hash then question mark keeps the latter
      {".LMR.Broken", Search(".LMR.Broken")},  // a topic naming no document
      {"\\section", Search("\\section", 1)},   // exact wins over an earlier prefix
      {"\\sectionm", Search("\\sectionm", 2, "\\sectionmark")},
      {"?", Search("", 0, "\\Section")},
      {"", {}},
      {std::string(10000, 'w'), Search(std::string(10000, 'w'))},
  };
  for (const auto& [command, calls] : rows) {
    FakePanel panel;
    EXPECT_EQ(ProcessCommand(panel, command.c_str(), 1), 1) << command;
    EXPECT_EQ(panel.calls, calls) << command;
  }
  FakePanel bare;
  bare.controls = false;
  ProcessCommand(bare, "\\section", 1);
  EXPECT_EQ(bare.calls, Calls{"show:\\section/1"});
  FakePanel panel;
  ProcessCommand(panel, "\\section", 0);
  EXPECT_EQ(panel.calls,
            (Calls{"search:\\section", "find:\\section/0", "select:0", "show:\\Section/1"}));
  KeywordListReset();
  DocumentCount = savedCount;
}

}  // namespace

namespace {

// Arguments are joined with blanks; only an argument holding a blank is
// quoted; a line beyond 1023 bytes is cut, never inside a character.
TEST(CommandLine, JoinsQuotesAndCuts) {
  const std::wstring longWord(1022, L'x');
  const struct {
    std::vector<std::wstring> args;
    std::string line;
  } rows[] = {
      {{L"prog"}, ""},
      {{L"prog", L"a", L"b c", L"d"}, "a \"b c\" d"},
      {{L"prog", L"", L"\"q\"\tt"}, " \"q\"\tt"},
      {{L"prog", longWord + L"\u00e9"}, std::string(1022, 'x')},  // the two-byte character goes
  };
  std::setlocale(LC_ALL, "C.UTF-8");
  for (const auto& row : rows) {
    std::vector<const wchar_t*> argv;
    for (const std::wstring& arg : row.args) argv.push_back(arg.c_str());
    EXPECT_EQ(Command_Line(int(argv.size()), argv.data()), row.line);
  }
  std::setlocale(LC_ALL, "C");
}

}  // namespace
