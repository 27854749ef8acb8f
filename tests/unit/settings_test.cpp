// Docuvane_Init: the private INI file, its Setup values, the word index.
#include "base/settings.h"

#include <gtest/gtest.h>

#include <climits>
#include <tuple>

#include "platform/profile.h"
#include "test_support.h"
#include "wordindex/locate.h"
#include "wordindex/wordindex.h"

namespace {

using testing_support::MessageCapture;

// A TeX tree of its own and a private system directory for bare INI names.
class SettingsTest : public ::testing::Test {
 protected:
  void SetUp() override { ProfileSetSystemDirectory((dir_ / "etc").c_str()); }
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
  testing_support::TempDir dir_;
  testing_support::ScopedEnv texmf_{"TEXMF", dir_ / "tex\\"}, texdir_{"TEXDIR", std::nullopt};
  const std::string tree_ini_ = "tex/Docuvane/Docuvane.ini";
};

TEST_F(SettingsTest, SetupValuesFromTheTreeOrTheSystemDirectory) {
  const std::tuple<std::string, std::string, int, const char*> rows[] = {
      {tree_ini_, "Trace=2\nRoot=D:\\TeX\\%s", 2, "D:\\TeX\\"},
      {tree_ini_, "Trace=abc\nRoot=%d%n%x%5s%", 0, "%d%n%x%5s%"},
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
  EXPECT_EQ(FormatRootValue("<%s> %% %d %n %-5s 50%", "x"), "<x> % %d %n %-5s 50%");
  EXPECT_EQ(FormatRootValue("%s%s", std::string(300, 'a').c_str()), std::string(255, 'a'));
}

TEST_F(SettingsTest, TracesAndTheWordIndexOpenedOrNot) {
  MessageCapture capture;
  EXPECT_EQ(Init("etc/unused.ini", ""), 1);
  EXPECT_TRUE(capture.Contains("Docuvane: Document Word Index File: NOT FOUND"));
  dir_.Write("tex/Update/command.Index", "not an index");
  Init(tree_ini_, "");
  EXPECT_EQ(WordIndexPath, dir_ / "tex/Update/command.Index");
  EXPECT_TRUE(capture.Contains("Docuvane_Init --- WXFileName=" + WordIndexPath));
  EXPECT_EQ(WordIndexHandle, nullptr) << "a damaged index is refused";
  std::filesystem::copy_file(DOCUVANE_FUZZ_CORPUS "/wordindex/worked-example.Index",
                             dir_ / "tex/Update/command.Index",
                             std::filesystem::copy_options::overwrite_existing);
  Init(tree_ini_, "");
  EXPECT_NE(WordIndexHandle, nullptr);
  CloseWordIndex();
}

}  // namespace
