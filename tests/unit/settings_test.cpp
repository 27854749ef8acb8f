// Docuvane_Init: the private INI file and its Setup values.
#include "base/settings.h"

#include <gtest/gtest.h>

#include <climits>
#include <tuple>

#include "base/trace.h"
#include "platform/profile.h"
#include "test_support.h"
#include "wordindex/locate.h"
#include "wordindex/wordindex.h"

namespace {

// A TeX tree of its own and a private system directory for bare INI names.
class SettingsTest : public ::testing::Test {
 protected:
  void SetUp() override { ProfileSetSystemDirectory((dir_ / "etc").c_str()); }
  void TearDown() override { ProfileSetSystemDirectory(nullptr); }
  int Init(const std::string& ini_file, const std::string& setup) {
    dir_.Write(ini_file, "[Setup]\n" + setup + "\n");
    TrovResetCaches(), ProfileCacheClear(), CloseWordIndex();
    WordIndexPath.clear(), IniFilePath.clear(), RootPath.clear();
    TraceMode = 12345;
    return Docuvane_Init(OpenInstalledWordIndex);
  }
  testing_support::TempDir dir_;
  testing_support::ScopedEnv texmf_{"TEXMF", dir_ / "tex\\"}, texdir_{"TEXDIR", std::nullopt};
  const std::string tree_ini_ = "tex/Docuvane/Docuvane.ini";
};

TEST_F(SettingsTest, SetupValuesFromTheTreeOrTheSystemDirectory) {
  const std::tuple<std::string, std::string, int, const char*> rows[] = {
      {tree_ini_, "Trace=2\nRoot=D:\\TeX\\%s", 2, "D:\\TeX\\"},
      {tree_ini_, "Trace=abc", 0, ""},
      {tree_ini_, "Trace=99999999999", INT_MAX, ""},
      {"etc/Docuvane.ini", "Trace=6\nRoot=/sys", 6, "/sys"},
  };
  for (const auto& [file, setup, trace, root] : rows) {
    EXPECT_EQ(Init(file, setup), 1) << setup;
    EXPECT_EQ(IniFilePath, file == tree_ini_ ? dir_ / tree_ini_ : "Docuvane.INI") << setup;
    EXPECT_EQ(TraceMode, trace) << setup;
    EXPECT_EQ(RootPath, root) << setup;
    std::filesystem::remove(dir_ / file);
  }
  EXPECT_EQ(FormatRootValue("%s%s", std::string(300, 'a').c_str()), std::string(255, 'a'));
}

}  // namespace

namespace {

// The trace's level comes from its words: the beginning first, then
// WARNING, then ERROR, case-sensitively; the message holds 511 characters.
TEST(Trace, LevelsFromTheWordsAndTheCut) {
  const std::pair<const char*, int> rows[] = {{"Openning document file: has ERROR", 2},
                                              {"Attach document: /ERROR/x", 4},
                                              {"a WARNING and an ERROR", 3},
                                              {"run lower case", 1},
                                              {"Launch", 2},
                                              {"plain", 1}};
  for (const auto& [text, level] : rows) EXPECT_EQ(TraceLevelOf(text), level) << text;
  testing_support::MessageCapture capture;
  TraceMessage(std::string(600, 'a').c_str(), "tail");
  TraceMessage("Private INI file: ", nullptr);
  ASSERT_EQ(capture.messages().size(), 2u);
  EXPECT_EQ(capture.messages()[0].text, std::string(511, 'a')) << "the text alone fills it";
  EXPECT_EQ(capture.messages()[1].text, "Private INI file: ");
}

}  // namespace
