// The path-search and message library: variables, patterns, categories,
// the window registry, messages, and the runtime directory it relies on.
#include <fcntl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include <cstdio>
#include <fstream>
#include <map>
#include <optional>
#include <sstream>
#include <string>
#include <vector>

#include "platform/paths.h"
#include "test_support.h"
#include "trovlib/trovlib.h"

using testing_support::MessageCapture;
using testing_support::ScopedEnv;
using testing_support::TempDir;

namespace {

std::string OrNull(const char* s) { return s ? std::string(s) : std::string("(null)"); }

std::string ReadAll(const std::string& path) {
  std::ifstream in(path, std::ios::binary);
  std::stringstream ss;
  ss << in.rdbuf();
  return ss.str();
}

TEST(TrovVar, EnvironmentFirstThenDefaults) {
  struct Row {
    const char* what;
    std::map<std::string, std::optional<std::string>> env;
    const char* name;
    std::optional<std::string> expected;
  } rows[] = {
      {"TEXMF from the environment", {{"TEXMF", "/t1:/t2"}}, "TEXMF", "/t1:/t2"},
      {"TEXMF defaults to the sample tree", {{"TEXMF", std::nullopt}}, "TEXMF", DOCUVANE_SAMPLE_TEXMF},
      {"an empty TEXMF counts as unset", {{"TEXMF", ""}}, "TEXMF", DOCUVANE_SAMPLE_TEXMF},
      {"TEXDIR defaults to TEXMF", {{"TEXMF", "/t1"}, {"TEXDIR", std::nullopt}}, "TEXDIR", "/t1"},
      {"VARTEX under XDG_CACHE_HOME", {{"VARTEX", std::nullopt}, {"XDG_CACHE_HOME", "/c"}}, "VARTEX",
       "/c/lomari"},
      {"VARTEX under HOME without XDG_CACHE_HOME",
       {{"VARTEX", std::nullopt}, {"XDG_CACHE_HOME", std::nullopt}, {"HOME", "/h"}}, "VARTEX",
       "/h/.cache/lomari"},
      {"DOCSERVER has no default", {{"DOCSERVER", std::nullopt}}, "DOCSERVER", std::nullopt},
      {"an unknown name", {{"NO_SUCH_TROV_VARIABLE", std::nullopt}}, "NO_SUCH_TROV_VARIABLE",
       std::nullopt},
  };
  for (const auto& row : rows) {
    std::vector<std::unique_ptr<ScopedEnv>> env;
    for (const auto& [name, value] : row.env) env.push_back(std::make_unique<ScopedEnv>(name.c_str(), value));
    const char* got = TrovVar(row.name);
    EXPECT_EQ(OrNull(got), row.expected ? *row.expected : "(null)") << row.what;
  }
}

// Two trees, searched in order.
class TrovSearchTest : public ::testing::Test {
 protected:
  void SetUp() override {
    a_ = dir_ / "A";
    b_ = dir_ / "B";
    for (const char* rel : {"A/Docuvane/Docuvane.ini", "A/Docuvane/sub/deep.txt", "A/Update/command.Index",
                            "A/doc/latex/base/guide.pdf", "A/doc/context/guide.pdf", "A/doc/dup.pdf",
                            "A/doc/a/b/dup.pdf", "A/doc/xlatex/base/only.pdf", "B/doc/only-b.pdf",
                            "B/Docuvane/Docuvane.ini", "B/Docuvane/logo.xpm", "A/Docuvane/logo.png",
                            "A/Docuvane/emblem.bmp"})
      dir_.Write(rel, "x");
    texmf_.emplace("TEXMF", a_ + ":" + b_);
    texdir_.emplace("TEXDIR", std::nullopt);
    myvar_.emplace("MY_TREE", a_ + "/");
  }

  TempDir dir_;
  std::string a_, b_;
  std::optional<ScopedEnv> texmf_, texdir_, myvar_;
};

TEST_F(TrovSearchTest, PatternsAndNames) {
  struct Row {
    const char* what;
    const char* spec;
    const char* name;
    const char* expected;  // relative to the temporary directory, or NULL
  } rows[] = {
      {"recursive pattern, first tree wins", "$TEXMF/Docuvane//", "Docuvane.ini", "A/Docuvane/Docuvane.ini"},
      {"braces and backslashes", "${TEXMF}\\Docuvane\\\\", "Docuvane.ini", "A/Docuvane/Docuvane.ini"},
      {"recursion reaches below", "$TEXMF/Docuvane//", "deep.txt", "A/Docuvane/sub/deep.txt"},
      {"without // only the directory itself", "$TEXMF/Docuvane", "deep.txt", nullptr},
      {"without // a direct file", "$TEXMF/Docuvane", "Docuvane.ini", "A/Docuvane/Docuvane.ini"},
      {"TEXDIR follows TEXMF", "${TEXDIR}/Update", "command.Index", "A/Update/command.Index"},
      {"variable with a trailing separator", "$MY_TREE/Update", "command.Index", "A/Update/command.Index"},
      {"second tree when the first lacks it", "TeX system documentation", "only-b.pdf", "B/doc/only-b.pdf"},
      {"shallower path first", "TeX system documentation", "dup.pdf", "A/doc/dup.pdf"},
      {"same depth: byte order", "TeX system documentation", "guide.pdf", "A/doc/context/guide.pdf"},
      {"directories in the name match the tail", "TeX system documentation", "base/guide.pdf",
       "A/doc/latex/base/guide.pdf"},
      {"a longer tail", "TeX system documentation", "latex/base/guide.pdf", "A/doc/latex/base/guide.pdf"},
      {"the tail matches whole steps", "TeX system documentation", "latex/base/only.pdf", nullptr},
      {"backslashes in the name", "TeX system documentation", "latex\\base\\guide.pdf",
       "A/doc/latex/base/guide.pdf"},
      {"a name that climbs out is refused", "$TEXMF/Docuvane", "../Update/command.Index", nullptr},
      {"unknown variable finds nothing", "$NO_SUCH_TROV_VARIABLE/doc//", "dup.pdf", nullptr},
      {"missing file", "TeX system documentation", "missing.pdf", nullptr},
      {"empty name", "TeX system documentation", "", nullptr},
      {"logo tried with image extensions in order", "Logo", "logo", "A/Docuvane/logo.png"},
      {"logo with another extension", "Logo", "emblem", "A/Docuvane/emblem.bmp"},
      {"logo with its extension given", "Logo", "logo.xpm", "B/Docuvane/logo.xpm"},
  };
  for (const auto& row : rows) {
    const char* got = TrovSearch(row.spec, row.name);
    EXPECT_EQ(OrNull(got), row.expected ? dir_ / row.expected : "(null)") << row.what;
  }
}

TEST_F(TrovSearchTest, AbsoluteNameIsTakenAsItIs) {
  std::string path = dir_ / "A/doc/dup.pdf";
  EXPECT_EQ(OrNull(TrovSearch("TeX system documentation", path.c_str())), path);
  EXPECT_EQ(TrovSearch("TeX system documentation", (dir_ / "A/doc/none.pdf").c_str()), nullptr);
}

TEST_F(TrovSearchTest, IndexIsBuiltOnceUntilReset) {
  ASSERT_EQ(TrovSearch("TeX system documentation", "later.pdf"), nullptr);
  dir_.Write("A/doc/new/later.pdf", "x");
  EXPECT_EQ(TrovSearch("TeX system documentation", "later.pdf"), nullptr)
      << "the tree is not walked again";
  TrovResetCaches();
  EXPECT_EQ(OrNull(TrovSearch("TeX system documentation", "later.pdf")), dir_ / "A/doc/new/later.pdf");
}

TEST_F(TrovSearchTest, SymbolicLinkLoopDoesNotHang) {
  ASSERT_EQ(symlink((dir_ / "A/doc").c_str(), (dir_ / "A/doc/a/loop").c_str()), 0);
  TrovResetCaches();
  EXPECT_EQ(OrNull(TrovSearch("TeX system documentation", "a/b/dup.pdf")), dir_ / "A/doc/a/b/dup.pdf");
}

TEST(TrovSearchProgram, SearchesPathForExecutables) {
  TempDir dir;
  std::string plain = dir.Write("one/viewer-data", "x");
  std::string tool1 = dir.Write("one/tool", "#!/bin/sh\n");
  std::string tool2 = dir.Write("two/tool", "#!/bin/sh\n");
  std::string only2 = dir.Write("two/only", "#!/bin/sh\n");
  dir.Write("two/viewer-data", "x");
  for (const auto& p : {tool1, tool2, only2}) chmod(p.c_str(), 0755);
  ScopedEnv path("PATH", dir / "one" + "::" + dir / "two");
  EXPECT_EQ(OrNull(TrovSearch("Program", "tool")), tool1) << "PATH order";
  EXPECT_EQ(OrNull(TrovSearch("Program", "only")), only2) << "later PATH entry";
  EXPECT_EQ(TrovSearch("Program", "viewer-data"), nullptr) << "not executable";
}

TEST(TrovSearchIcon, TreeFirstThenThemesBySize) {
  TempDir dir;
  ScopedEnv texmf("TEXMF", dir / "tex");
  for (const char* rel : {"tex/Docuvane/icons/mine.png", "t1/32x32/apps/mine.png",
                          // the TeX tree's own sized icons are ranked too
                          "tex/Docuvane/icons/16x16/sized.png", "tex/Docuvane/icons/24x24/sized.png",
                          "t1/16x16/apps/x.png", "t1/32x32/apps/x.png", "t1/24x24/apps/x.xpm",
                          "t1/22x22/apps/x.png", "t1/32x32/apps/big.png", "t1/16x16/apps/small.ico",
                          "t1/32x32/apps/small.png", "t1/48x48/apps/huge.png", "t2/24x24/apps/other.png",
                          "t1/24x24/apps/dotted.name.png"})
    dir.Write(rel, "x");
  struct Row {
    const char* what;
    std::optional<std::string> themes;
    const char* name;
    const char* expected;
  } rows[] = {
      {"the TeX tree before the themes", dir / "t1", "mine", "tex/Docuvane/icons/mine.png"},
      {"24 before 22, 16 and 32, whatever the extension", dir / "t1", "x", "t1/24x24/apps/x.xpm"},
      {"an extension given is kept", dir / "t1", "x.png", "t1/22x22/apps/x.png"},
      {"16 before 32", dir / "t1", "small", "t1/16x16/apps/small.ico"},
      {"32 when nothing smaller", dir / "t1", "big", "t1/32x32/apps/big.png"},
      {"other sizes are not searched", dir / "t1", "huge", nullptr},
      {"sized directories in the TeX tree", dir / "t1", "sized", "tex/Docuvane/icons/24x24/sized.png"},
      {"second theme", dir / "t1" + ":" + dir / "t2", "other", "t2/24x24/apps/other.png"},
      {"a dotted name counts as having an extension", dir / "t1", "dotted.name", nullptr},
      {"empty list: no desktop themes", std::string(), "x", nullptr},
  };
  for (const auto& row : rows) {
    ScopedEnv themes("TROVLIB_ICON_THEMES", row.themes);
    EXPECT_EQ(OrNull(TrovSearch("Icon", row.name)), row.expected ? dir / row.expected : "(null)") << row.what;
  }
}

TEST(TrovFind, ExpandsToADirectory) {
  ScopedEnv vartex("VARTEX", "/var/tex");
  ScopedEnv unset("NO_SUCH_TROV_VARIABLE", std::nullopt);
  ScopedEnv two("TWO_TREES", "/one:/two");
  struct Row {
    const char* pattern;
    const char* expected;
  } rows[] = {
      {"?<$VARTEX\\doc\\>", "/var/tex/doc/"},
      {"?<${VARTEX}/doc>", "/var/tex/doc/"},
      {"?<$NO_SUCH_TROV_VARIABLE\\doc\\>", "/doc/"},
      {"?<$TWO_TREES/doc>", "/one/doc/"},
      {"$VARTEX", "/var/tex/"},
  };
  for (const auto& row : rows) EXPECT_STREQ(TrovFind(row.pattern), row.expected) << row.pattern;
  EXPECT_NE(TrovFind(nullptr), nullptr);
}

TEST(TrovINIFile, SystemFileInTheFirstTree) {
  ScopedEnv texmf("TEXMF", "/first/:/second");
  EXPECT_STREQ(TrovINIFile(1), "/first/lomari.ini");
}

TEST(TrovWindows, RegistryInTheRuntimeDirectory) {
  TempDir dir;
  ScopedEnv runtime("XDG_RUNTIME_DIR", dir.path());
  MessageCapture capture;
  EXPECT_EQ(TrovLookupWindow("Docuvane"), 0ul) << "nothing registered";
  TrovPublishWindow("Docuvane", 0x3a00007ul);
  EXPECT_EQ(TrovLookupWindow("Docuvane"), 0x3a00007ul);
  EXPECT_EQ(ReadAll(dir / "lomari/window-Docuvane"), "60817415\n");
  TrovPublishWindow("Docuvane", 42);
  EXPECT_EQ(TrovLookupWindow("Docuvane"), 42ul) << "a later start replaces it";
  EXPECT_EQ(TrovLookupWindow("Other"), 0ul);

  TrovPublishWindow("../escape", 7);
  EXPECT_FALSE(std::ifstream(dir / "escape").good()) << "names stay inside the directory";
  EXPECT_EQ(TrovLookupWindow("../escape"), 7ul);

  for (const char* junk : {"", "abc", "12abc", "-5", "99999999999999999999999"}) {
    dir.Write("lomari/window-Junk", junk);
    EXPECT_EQ(TrovLookupWindow("Junk"), 0ul) << "content '" << junk << "'";
  }
  EXPECT_TRUE(capture.messages().empty());
}

TEST(RuntimeDirectory, CreatedPrivateOrRefused) {
  TempDir dir;
  struct Row {
    const char* what;
    std::function<void(const std::string& lomari)> prepare;
    bool accepted;
  } rows[] = {
      {"created when missing", [](const std::string&) {}, true},
      {"an existing private directory", [](const std::string& p) { mkdir(p.c_str(), 0700); }, true},
      {"mode 0755 is refused",
       [](const std::string& p) {
         mkdir(p.c_str(), 0700);
         chmod(p.c_str(), 0755);
       },
       false},
      {"a plain file is refused", [](const std::string& p) { std::ofstream(p) << "x"; }, false},
      {"a symbolic link to a private directory is refused",
       [](const std::string& p) {
         std::string target = p + "-target";
         mkdir(target.c_str(), 0700);
         symlink(target.c_str(), p.c_str());
       },
       false},
  };
  int n = 0;
  for (const auto& row : rows) {
    std::string base = dir / std::to_string(n++);
    mkdir(base.c_str(), 0700);
    row.prepare(base + "/lomari");
    ScopedEnv runtime("XDG_RUNTIME_DIR", base);
    MessageCapture capture;
    std::string got = RuntimeDirectory();
    if (row.accepted) {
      EXPECT_EQ(got, base + "/lomari") << row.what;
      struct stat st;
      ASSERT_EQ(lstat(got.c_str(), &st), 0) << row.what;
      EXPECT_EQ(st.st_mode & 0777, 0700u) << row.what;
      EXPECT_TRUE(capture.messages().empty()) << row.what;
    } else {
      EXPECT_EQ(got, "") << row.what;
      EXPECT_EQ(capture.LevelOf("ERROR: "), 5) << row.what;
      EXPECT_EQ(TrovLookupWindow("Docuvane"), 0ul) << row.what;
    }
  }
}

TEST(FixSlashes, EveryBackslashBecomesTheSeparator) {
  char text[] = "D:\\tex\\Docuvane/Docuvane.ini";
  EXPECT_STREQ(Fix_Slashes(text), "D:/tex/Docuvane/Docuvane.ini");
  std::string s = "\\\\server\\share";
  EXPECT_EQ(Fix_Slashes(s), "//server/share");
  EXPECT_EQ(Fix_Slashes(static_cast<char*>(nullptr)), nullptr);
}

TEST(TrovMessage, LogFileLineFormat) {
  TempDir dir;
  ScopedEnv log("TROVLIB_LOG", dir / "trov.log");
  ScopedEnv quiet("TROVLIB_STDERR_LEVEL", "1000");
  struct Row {
    const char* prefix;
    const char* text;
    int level;
    const char* line;
  } rows[] = {
      {"ERROR: DDE client ", "no server", 5, "5\tERROR: DDE client no server\n"},
      {"Docuvane: ", "", 1, "1\tDocuvane: \n"},
      {"INFO: x ", "two\nlines\r", 2, "2\tINFO: x two lines \n"},
      {nullptr, "bare", 260, "260\tbare\n"},
  };
  std::string expected;
  for (const auto& row : rows) {
    TrovMessage(row.prefix, row.text, row.level);
    expected += row.line;
  }
  EXPECT_EQ(ReadAll(dir / "trov.log"), expected);
}

TEST(TrovMessage, StandardErrorFromTheBoundLevel) {
  TempDir dir;
  ScopedEnv log("TROVLIB_LOG", std::nullopt);
  struct Row {
    std::optional<std::string> bound;
    int level;
    bool shown;
  } rows[] = {
      {std::nullopt, 3, false}, {std::nullopt, 4, true}, {std::nullopt, 260, true},
      {"2", 2, true},           {"2", 1, false},         {"junk", 4, true},
  };
  for (const auto& row : rows) {
    ScopedEnv bound("TROVLIB_STDERR_LEVEL", row.bound);
    std::string file = dir / "stderr";
    int saved = dup(STDERR_FILENO);
    int fd = open(file.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
    dup2(fd, STDERR_FILENO);
    TrovMessage("WARNING: t ", "msg", row.level);
    dup2(saved, STDERR_FILENO);
    close(fd);
    close(saved);
    EXPECT_EQ(ReadAll(file), row.shown ? "WARNING: t msg\n" : "")
        << "bound " << row.bound.value_or("unset") << " level " << row.level;
  }
}

TEST(TrovMessage, ProcessesAppendingToOneLogKeepWholeLines) {
  TempDir dir;
  ScopedEnv log("TROVLIB_LOG", dir / "shared.log");
  ScopedEnv quiet("TROVLIB_STDERR_LEVEL", "1000");
  constexpr int kProcesses = 4, kLines = 300;
  const std::string filler(200, 'f');
  std::vector<pid_t> children;
  for (int p = 0; p < kProcesses; ++p) {
    pid_t pid = fork();
    if (pid == 0) {
      for (int i = 0; i < kLines; ++i) TrovMessage("P ", (std::to_string(p) + filler).c_str(), 1);
      _exit(0);
    }
    children.push_back(pid);
  }
  for (pid_t pid : children) waitpid(pid, nullptr, 0);
  std::istringstream in(ReadAll(dir / "shared.log"));
  std::string line;
  int count = 0;
  while (std::getline(in, line)) {
    ++count;
    ASSERT_EQ(line.size(), 2u + 2u + 1u + filler.size()) << "line " << count;
    EXPECT_EQ(line.substr(0, 4), "1\tP ");
  }
  EXPECT_EQ(count, kProcesses * kLines);
}

}  // namespace
