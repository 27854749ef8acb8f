// Tracing, and Docuvane_Init: the private INI file, its Setup values, the word index.
#include "base/settings.h"

#include <gtest/gtest.h>

#include <climits>
#include <filesystem>
#include <list>
#include <string>

#include "platform/profile.h"
#include "base/trace.h"
#include "test_support.h"
#include "wordindex/locate.h"
#include "wordindex/wordindex.h"

using testing_support::MessageCapture;
using testing_support::TempDir;

namespace {

// A TeX tree of its own, a private system directory for bare INI names, and
// the process-wide values back at their start-up state.
class SettingsTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ProfileSetSystemDirectory((dir_ / "etc").c_str());
    env_.emplace_back("TEXMF", dir_ / "tex\\");
    env_.emplace_back("TEXDIR", std::nullopt);
    env_.emplace_back("TROVLIB_STDERR_LEVEL", "1000");
  }
  void TearDown() override { ProfileSetSystemDirectory(nullptr); }
  int Init(const std::string& ini_file, const std::string& setup) {
    dir_.Write(ini_file, "[Setup]\n" + setup + "\n");
    TrovResetCaches();
    ProfileCacheClear();
    CloseWordIndex();
    WordIndexPath.clear(), IniFilePath.clear(), RootPath.clear();
    TraceMode = 12345;
    return Docuvane_Init(OpenInstalledWordIndex);
  }
  TempDir dir_;
  std::list<testing_support::ScopedEnv> env_;
};

TEST_F(SettingsTest, SetupValuesFromTheTreeOrTheSystemDirectory) {
  const std::string in_tree = "tex/Docuvane/Docuvane.ini";
  struct Row {
    std::string file, setup;
    int trace;
    const char* root;
  } rows[] = {
      {in_tree, "Trace=2\nRoot=D:\\TeX\\%s", 2, "D:\\TeX\\"},
      {in_tree, "Trace=abc\nRoot=%d%n%x%5s%", 0, "%d%n%x%5s%"},
      {in_tree, "TRACE=  7x", 7, ""},
      {in_tree, "Trace=99999999999", INT_MAX, ""},
      {in_tree, "Trace=-99999999999", INT_MIN, ""},
      {in_tree, "Other=1", 0, ""},
      {"etc/Docuvane.ini", "Trace=6\nRoot=/sys", 6, "/sys"},
  };
  for (const auto& row : rows) {
    EXPECT_EQ(Init(row.file, row.setup), 1) << row.setup;
    EXPECT_EQ(IniFilePath, row.file == in_tree ? dir_ / in_tree : "Docuvane.INI") << row.setup;
    EXPECT_EQ(TraceMode, row.trace) << row.setup;
    EXPECT_EQ(RootPath, row.root) << row.setup;
    std::filesystem::remove(dir_ / row.file);
  }
}

TEST(FormatRootValue, OnlyPercentSTakesTheArgumentAndTheResultIsCutTo255) {
  EXPECT_EQ(FormatRootValue("<%s> %% %d %n %-5s 50%", "x"), "<x> % %d %n %-5s 50%");
  EXPECT_EQ(FormatRootValue("[%s]", nullptr), "[]");
  EXPECT_EQ(FormatRootValue("%s%s", std::string(300, 'a').c_str()), std::string(255, 'a'));
  EXPECT_EQ(FormatRootValue(nullptr, "x"), "");
}

TEST_F(SettingsTest, TracesAndTheWordIndexOpenedOrNot) {
  MessageCapture capture;
  EXPECT_EQ(Init("etc/unused.ini", ""), 1);
  std::string lines;
  for (const auto& m : capture.messages()) lines += m.line() + "|";
  EXPECT_EQ(lines,
            "Docuvane: Docuvane_Init --- Start|Docuvane: Private INI file: Docuvane.INI|"
            "Docuvane: Document Word Index File: NOT FOUND|Docuvane: Docuvane_Init --- WXFileName=|"
            "Docuvane: Docuvane --- End|");

  dir_.Write("tex/Update/command.Index", "not an index");
  Init("tex/Docuvane/Docuvane.ini", "");
  EXPECT_EQ(WordIndexPath, dir_ / "tex/Update/command.Index");
  EXPECT_TRUE(capture.Contains("Docuvane_Init --- WXFileName=" + WordIndexPath));
  EXPECT_EQ(WordIndexHandle, nullptr) << "a damaged index is refused";
  std::filesystem::copy_file(
      std::filesystem::path(DOCUVANE_FUZZ_CORPUS) / "wordindex/worked-example.Index",
      dir_ / "tex/Update/command.Index", std::filesystem::copy_options::overwrite_existing);
  Init("tex/Docuvane/Docuvane.ini", "");
  EXPECT_NE(WordIndexHandle, nullptr);
  CloseWordIndex();
}

TEST(TraceMessage, LevelFromTheWordsAndJoinWithin511) {
  const std::string text_510(510, 'a');
  struct Row {
    const char* what;
    std::string text;
    const char* argument;
    std::string expected;
    int level;
  } rows[] = {
      {"text and argument, no separator added", "Private INI file: ", "D.INI",
       "Private INI file: D.INI", 1},
      {"NULL argument gives the text alone", "Start", nullptr, "Start", 1},
      {"Run at the start", "", "Run viewer", "Run viewer", 2},
      {"Open at the start wins over ERROR", "Openning document file: ", "ERROR.pdf",
       "Openning document file: ERROR.pdf", 2},
      {"Launch at the start wins over WARNING", "Launch WARNING", nullptr, "Launch WARNING", 2},
      {"WARNING anywhere, and over ERROR", "ERROR and WARNING", nullptr, "ERROR and WARNING", 3},
      {"ERROR anywhere, also in the argument", "Attach document: ", "/x/ERROR/y.pdf",
       "Attach document: /x/ERROR/y.pdf", 4},
      {"lower case is plain", "run a warning error", nullptr, "run a warning error", 1},
      {"a word inside is not a beginning", " Run", nullptr, " Run", 1},
      {"a long text is cut to 511 and the argument dropped", std::string(600, 't'), "ERROR",
       std::string(511, 't'), 1},
      {"the argument is cut so that the whole stays 511", text_510, "ERROR", text_510 + "E", 1},
  };
  for (const auto& row : rows) {
    MessageCapture capture;
    TraceMessage(row.text.c_str(), row.argument);
    ASSERT_EQ(capture.messages().size(), 1u) << row.what;
    const auto& m = capture.messages()[0];
    EXPECT_EQ(m.prefix + "|" + m.text, "Docuvane: |" + row.expected) << row.what;
    EXPECT_EQ(m.level, row.level) << row.what;
    EXPECT_EQ(TraceLevelOf(row.expected.c_str()), row.level) << row.what;
  }
}

}  // namespace
