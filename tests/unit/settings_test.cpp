// Docuvane_Init: finding the private INI file, its Setup values, and the
// hand-over to the word index.
#include <gtest/gtest.h>

#include <climits>
#include <filesystem>
#include <optional>
#include <string>

#include "platform/profile.h"
#include "shell/settings.h"
#include "test_support.h"
#include "wordindex/locate.h"
#include "wordindex/wordindex.h"

using testing_support::MessageCapture;
using testing_support::ScopedEnv;
using testing_support::TempDir;

namespace {

// A TeX tree of its own, an empty system directory for bare INI names, and
// the process-wide values back at their start-up state.
class SettingsTest : public ::testing::Test {
 protected:
  void SetUp() override {
    dir_.Write("etc/.keep", "");
    ProfileSetSystemDirectory((dir_ / "etc").c_str());
    texmf_.emplace("TEXMF", dir_ / "tex");
    texdir_.emplace("TEXDIR", std::nullopt);
    quiet_.emplace("TROVLIB_STDERR_LEVEL", "1000");
    IniFilePath.clear();
    TraceMode = 0;
    RootPath.clear();
    CloseWordIndex();
    WordIndexPath.clear();
  }
  void TearDown() override {
    CloseWordIndex();
    WordIndexPath.clear();
    ProfileSetSystemDirectory(nullptr);
  }

  void WriteIni(const std::string& setup) {
    dir_.Write("tex/Docuvane/Docuvane.ini", "[Setup]\n" + setup + "\n");
    TrovResetCaches();
    ProfileCacheClear();
  }

  TempDir dir_;
  std::optional<ScopedEnv> texmf_, texdir_, quiet_;
};

TEST_F(SettingsTest, TraceValueReadLikeAtoi) {
  struct Row {
    const char* line;
    int expected;
  } rows[] = {
      {"Trace=2", 2},          {"Trace=abc", 0},     {"Trace=-1", -1},
      {"Trace=  7x", 7},       {"Trace=+3", 3},      {"Trace=", 0},
      {"Other=1", 0},          {"TRACE=4", 4},       {"Trace=99999999999", INT_MAX},
      {"Trace=-99999999999", INT_MIN},
  };
  for (const auto& row : rows) {
    WriteIni(row.line);
    TraceMode = 12345;
    EXPECT_EQ(Docuvane_Init(), 1) << row.line;
    EXPECT_EQ(TraceMode, row.expected) << row.line;
  }
}

TEST_F(SettingsTest, RootValueFormattedWithoutPrintf) {
  struct Row {
    const char* line;
    const char* expected;
  } rows[] = {
      {"Root=D:\\TeX\\%s", "D:\\TeX\\"},
      {"Root=100%%", "100%"},
      {"Root=%d%n%x%5s%", "%d%n%x%5s%"},
  };
  for (const auto& row : rows) {
    WriteIni(row.line);
    RootPath.clear();
    Docuvane_Init();
    EXPECT_EQ(RootPath, row.expected) << row.line;
  }
}

TEST(FormatRootValue, ConversionsAndLimit) {
  const std::string long_arg(300, 'a');
  struct Row {
    const char* what;
    const char* value;
    const char* argument;
    std::string expected;
  } rows[] = {
      {"%s takes the argument", "<%s>", "x", "<x>"},
      {"%% gives %", "%%s", "x", "%s"},
      {"other conversions stay text", "%d %n %p %-5s", "x", "%d %n %p %-5s"},
      {"a trailing % stays", "50%", "x", "50%"},
      {"NULL argument is empty", "[%s]", nullptr, "[]"},
      {"cut to 255", "%s%s", long_arg.c_str(), std::string(255, 'a')},
      {"NULL value", nullptr, "x", ""},
  };
  for (const auto& row : rows) EXPECT_EQ(FormatRootValue(row.value, row.argument), row.expected) << row.what;
}

TEST_F(SettingsTest, FoundPathUsesForwardSlashes) {
  WriteIni("Trace=1");
  ScopedEnv backslashed("TEXMF", dir_ / "tex\\");
  Docuvane_Init();
  EXPECT_EQ(IniFilePath, dir_ / "tex/Docuvane/Docuvane.ini");
  EXPECT_EQ(TraceMode, 1);
}

TEST_F(SettingsTest, NoIniFileAnywhere) {
  MessageCapture capture;
  EXPECT_EQ(Docuvane_Init(), 1);
  EXPECT_EQ(IniFilePath, "Docuvane.INI");
  EXPECT_EQ(TraceMode, 0);
  EXPECT_EQ(RootPath, "");
  const char* expected[] = {
      "Docuvane: Docuvane_Init --- Start",
      "Docuvane: Private INI file: Docuvane.INI",
      "Docuvane: Docuvane_Init --- WXFileName=",
      "Docuvane: Docuvane --- End",
  };
  std::size_t at = 0;
  for (const auto& m : capture.messages())
    if (at < std::size(expected) && m.line() == expected[at]) ++at;
  EXPECT_EQ(at, std::size(expected)) << "traces in order; missing from: " << (at < 4 ? expected[at] : "");
  EXPECT_EQ(capture.messages().back().line(), "Docuvane: Docuvane --- End");
}

TEST_F(SettingsTest, BareNameFallsBackToTheSystemDirectory) {
  dir_.Write("etc/Docuvane.ini", "[Setup]\nTrace=6\nRoot=/sys\n");
  ProfileCacheClear();
  Docuvane_Init();
  EXPECT_EQ(IniFilePath, "Docuvane.INI");
  EXPECT_EQ(TraceMode, 6);
  EXPECT_EQ(RootPath, "/sys");
}

TEST_F(SettingsTest, WordIndexOpenedOrNot) {
  WriteIni("Trace=0");
  dir_.Write("tex/Update/command.Index", "not an index");
  TrovResetCaches();
  MessageCapture capture;
  EXPECT_EQ(Docuvane_Init(), 1);
  EXPECT_EQ(WordIndexPath, dir_ / "tex/Update/command.Index");
  EXPECT_TRUE(capture.Contains("Docuvane_Init --- WXFileName=" + WordIndexPath));
  EXPECT_EQ(WordIndexHandle, nullptr) << "a damaged index is refused";
  EXPECT_EQ(capture.messages().back().line(), "Docuvane: Docuvane --- End");

  const std::filesystem::path good =
      std::filesystem::path(DOCUVANE_FUZZ_CORPUS) / "wordindex" / "worked-example.Index";
  if (!std::filesystem::exists(good)) GTEST_SKIP() << "no sample index at " << good;
  std::filesystem::copy_file(good, dir_ / "tex/Update/command.Index",
                             std::filesystem::copy_options::overwrite_existing);
  WordIndexPath.clear();
  Docuvane_Init();
  EXPECT_NE(WordIndexHandle, nullptr);
}

}  // namespace
