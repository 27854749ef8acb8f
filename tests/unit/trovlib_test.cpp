// The path-search and message library and the runtime directory it relies on.
#include "trovlib/trovlib.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <fstream>
#include <list>
#include <optional>
#include <sstream>
#include <string>

#include "platform/paths.h"
#include "test_support.h"

using testing_support::MessageCapture;
using testing_support::ScopedEnv;
using testing_support::TempDir;

namespace {

std::string OrNull(const char* s) { return s ? s : "(null)"; }

std::string ReadAll(const std::string& path) {
  std::stringstream ss;
  ss << std::ifstream(path, std::ios::binary).rdbuf();
  return ss.str();
}

TEST(TrovVar, EnvironmentFirstThenDefaultsAsFindExpandsThem) {
  ScopedEnv texmf("TEXMF", ""), texdir("TEXDIR", {}), vartex("VARTEX", {}), home("HOME", "/h"),
      cache("XDG_CACHE_HOME", {}), server("DOCSERVER", {}), none("NO_SUCH_TROV_VARIABLE", {});
  EXPECT_STREQ(TrovVar("TEXMF"), DOCUVANE_SAMPLE_TEXMF) << "empty counts as unset";
  EXPECT_STREQ(TrovVar("TEXDIR"), DOCUVANE_SAMPLE_TEXMF);
  EXPECT_STREQ(TrovVar("VARTEX"), "/h/.cache/lomari");
  EXPECT_EQ(TrovVar("DOCSERVER"), nullptr);
  ScopedEnv texmf2("TEXMF", "/one:/two"), cache2("XDG_CACHE_HOME", "/c");
  EXPECT_STREQ(TrovVar("TEXDIR"), "/one:/two");
  EXPECT_STREQ(TrovFind("?<$VARTEX\\doc\\>"), "/c/lomari/doc/");
  EXPECT_STREQ(TrovFind("?<${VARTEX}/doc>"), "/c/lomari/doc/");
  EXPECT_STREQ(TrovFind("?<$NO_SUCH_TROV_VARIABLE\\doc\\>"), "/doc/");
  EXPECT_STREQ(TrovFind("?<$TEXMF/doc>"), "/one/doc/");
  EXPECT_NE(TrovFind(nullptr), nullptr);
  ScopedEnv slashed("TEXMF", "/first/:/second");
  EXPECT_STREQ(TrovINIFile(1), "/first/lomari.ini");
}

// Two TeX trees, two icon themes and two PATH directories, each searched in order.
class TrovSearchTest : public ::testing::Test {
 protected:
  void SetUp() override {
    std::istringstream files(
        "A/Docuvane/Docuvane.ini A/Docuvane/sub/deep.txt A/Update/command.Index A/doc/dup.pdf "
        "A/doc/latex/base/guide.pdf A/doc/context/guide.pdf A/doc/a/b/dup.pdf B/doc/only-b.pdf "
        "A/doc/xlatex/base/only.pdf A/Docuvane/logo.png B/Docuvane/logo.xpm bin1/data "
        "A/Docuvane/icons/mine.png t1/32x32/apps/mine.png A/Docuvane/icons/24x24/sized.png "
        "A/Docuvane/icons/16x16/sized.png t1/16x16/apps/x.png t1/24x24/apps/x.xpm "
        "t1/22x22/apps/x.png t1/16x16/apps/small.ico t1/32x32/apps/small.png t1/32x32/apps/big.png "
        "t1/48x48/apps/huge.png t2/24x24/apps/other.png t1/24x24/apps/dotted.name.png");
    for (std::string rel; files >> rel;) dir_.Write(rel, "x");
    for (const char* rel : {"bin1/tool", "bin2/tool", "bin2/only"})
      chmod(dir_.Write(rel, "").c_str(), 0755);
    env_.emplace_back("TEXMF", dir_ / "A:" + dir_ / "B");
    env_.emplace_back("MY_TREE", dir_ / "A/");
    env_.emplace_back("PATH", dir_ / "bin1::" + dir_ / "bin2");
    env_.emplace_back("TROVLIB_ICON_THEMES", dir_ / "t1:" + dir_ / "t2");
  }
  std::string Found(const char* spec, const std::string& name) {
    return OrNull(TrovSearch(spec, name.c_str()));
  }
  TempDir dir_;
  std::list<ScopedEnv> env_;
};

TEST_F(TrovSearchTest, PatternsCategoriesAndNames) {
  const char* docs = "TeX system documentation";
  struct Row {
    const char *what, *spec;
    std::string name;
    const char* expected;  // relative to the temporary directory, or NULL
  } rows[] = {
      {"// recursion, first tree wins", "$TEXMF/Docuvane//", "Docuvane.ini",
       "A/Docuvane/Docuvane.ini"},
      {"braces and backslashes", "${TEXMF}\\Docuvane\\\\", "deep.txt", "A/Docuvane/sub/deep.txt"},
      {"without // only the directory itself", "$TEXMF/Docuvane", "deep.txt", nullptr},
      {"variable with a trailing separator", "$MY_TREE/Update", "command.Index",
       "A/Update/command.Index"},
      {"unknown variable finds nothing", "$NO_SUCH_TROV_VARIABLE/doc//", "dup.pdf", nullptr},
      {"second tree when the first lacks it", docs, "only-b.pdf", "B/doc/only-b.pdf"},
      {"shallower path first", docs, "dup.pdf", "A/doc/dup.pdf"},
      {"same depth: byte order", docs, "guide.pdf", "A/doc/context/guide.pdf"},
      {"directories in the name match the tail", docs, "latex\\base/guide.pdf",
       "A/doc/latex/base/guide.pdf"},
      {"the tail matches whole steps", docs, "latex/base/only.pdf", nullptr},
      {"a name that climbs out is refused", "$TEXMF/Docuvane", "../Update/command.Index", nullptr},
      {"absolute name taken as it is", docs, dir_ / "A/doc/dup.pdf", "A/doc/dup.pdf"},
      {"logo tried with image extensions", "Logo", "logo", "A/Docuvane/logo.png"},
      {"logo with its extension given", "Logo", "logo.xpm", "B/Docuvane/logo.xpm"},
      {"programs in PATH order", "Program", "tool", "bin1/tool"},
      {"a later PATH entry", "Program", "only", "bin2/only"},
      {"not executable", "Program", "data", nullptr},
      {"icon: the TeX tree before the themes", "Icon", "mine", "A/Docuvane/icons/mine.png"},
      {"icon: 24, 22, 16, whatever the extension", "Icon", "x", "t1/24x24/apps/x.xpm"},
      {"icon: an extension given is kept", "Icon", "x.png", "t1/22x22/apps/x.png"},
      {"icon: 16 before 32", "Icon", "small", "t1/16x16/apps/small.ico"},
      {"icon: 32 last", "Icon", "big", "t1/32x32/apps/big.png"},
      {"icon: other sizes are not searched", "Icon", "huge", nullptr},
      {"icon: sizes in the TeX tree", "Icon", "sized", "A/Docuvane/icons/24x24/sized.png"},
      {"icon: second theme", "Icon", "other", "t2/24x24/apps/other.png"},
      {"icon: a dotted name has an extension", "Icon", "dotted.name", nullptr},
  };
  for (const auto& row : rows)
    EXPECT_EQ(Found(row.spec, row.name), row.expected ? dir_ / row.expected : "(null)") << row.what;
  ScopedEnv no_themes("TROVLIB_ICON_THEMES", "");
  EXPECT_EQ(Found("Icon", "x"), "(null)") << "no themes";
}

TEST_F(TrovSearchTest, IndexBuiltOnceUntilResetAndLinkLoopsEnd) {
  ASSERT_EQ(Found("TeX system documentation", "later.pdf"), "(null)");
  dir_.Write("A/doc/new/later.pdf", "x");
  EXPECT_EQ(Found("TeX system documentation", "later.pdf"), "(null)") << "not walked again";
  ASSERT_EQ(symlink((dir_ / "A/doc").c_str(), (dir_ / "A/doc/a/loop").c_str()), 0);
  TrovResetCaches();
  EXPECT_EQ(Found("TeX system documentation", "later.pdf"), dir_ / "A/doc/new/later.pdf");
  EXPECT_EQ(Found("TeX system documentation", "a/b/dup.pdf"), dir_ / "A/doc/a/b/dup.pdf");
}

TEST(TrovWindows, RegistryInTheRuntimeDirectory) {
  TempDir dir;
  ScopedEnv runtime("XDG_RUNTIME_DIR", dir.path());
  MessageCapture capture;
  EXPECT_EQ(TrovLookupWindow("Docuvane"), 0ul) << "nothing registered";
  TrovPublishWindow("Docuvane", 0x3a00007ul);
  EXPECT_EQ(ReadAll(dir / "lomari/window-Docuvane"), "60817415\n");
  TrovPublishWindow("Docuvane", 42);
  EXPECT_EQ(TrovLookupWindow("Docuvane"), 42ul) << "a later start replaces it";
  TrovPublishWindow("../escape", 7);
  EXPECT_FALSE(std::ifstream(dir / "escape").good()) << "names stay inside the directory";
  EXPECT_EQ(TrovLookupWindow("../escape"), 7ul);
  for (const char* junk : {"", "12abc", "-5", "99999999999999999999999"}) {
    dir.Write("lomari/window-Junk", junk);
    EXPECT_EQ(TrovLookupWindow("Junk"), 0ul) << "content '" << junk << "'";
  }
  EXPECT_TRUE(capture.messages().empty());
}

TEST(RuntimeDirectory, CreatedPrivateOrRefused) {
  TempDir dir;
  for (const char* what : {"missing", "private", "0755", "a file", "a link"}) {
    std::string base = dir / what, path = base + "/lomari", w = what;
    mkdir(base.c_str(), 0700);
    if (w == "private" || w == "0755") mkdir(path.c_str(), 0700);
    if (w == "0755") chmod(path.c_str(), 0755);
    if (w == "a file") dir.Write(w + "/lomari", "x");
    ASSERT_TRUE(w != "a link" || symlink((dir / "private/lomari").c_str(), path.c_str()) == 0);
    bool accepted = w == "missing" || w == "private";
    ScopedEnv runtime("XDG_RUNTIME_DIR", base);
    MessageCapture capture;
    EXPECT_EQ(RuntimeDirectory(), accepted ? path : "") << what;
    EXPECT_EQ(capture.LevelOf("ERROR: "), accepted ? -1 : 5) << what;
    struct stat st {};
    EXPECT_TRUE(!accepted || (lstat(path.c_str(), &st) == 0 && (st.st_mode & 0777) == 0700))
        << what;
  }
}

TEST(TrovMessage, LogLinesAndStandardErrorBound) {
  TempDir dir;
  {
    ScopedEnv log("TROVLIB_LOG", dir / "trov.log"), quiet("TROVLIB_STDERR_LEVEL", "1000");
    TrovMessage("ERROR: DDE client ", "no server", 5);
    TrovMessage("INFO: x ", "two\nlines\r", 2);
    TrovMessage(nullptr, "bare", 260);
    EXPECT_EQ(ReadAll(dir / "trov.log"),
              "5\tERROR: DDE client no server\n2\tINFO: x two lines \n260\tbare\n");
  }
  struct Row {
    const char* bound;
    int level;
    bool shown;
  } rows[] = {
      {nullptr, 3, false}, {nullptr, 4, true}, {"2", 2, true}, {"2", 1, false}, {"junk", 4, true}};
  for (const auto& row : rows) {
    ScopedEnv bound("TROVLIB_STDERR_LEVEL",
                    row.bound ? std::optional<std::string>(row.bound) : std::nullopt);
    int saved = dup(2), fd = open((dir / "err").c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
    dup2(fd, 2);
    TrovMessage("WARNING: t ", "msg", row.level);
    dup2(saved, 2);
    close(fd), close(saved);
    EXPECT_EQ(ReadAll(dir / "err"), row.shown ? "WARNING: t msg\n" : "")
        << "bound " << OrNull(row.bound) << " level " << row.level;
  }
}

TEST(TrovMessage, ProcessesAppendingToOneLogKeepWholeLines) {
  TempDir dir;
  ScopedEnv log("TROVLIB_LOG", dir / "shared.log"), quiet("TROVLIB_STDERR_LEVEL", "1000");
  const std::string text(200, 'f');
  for (int p = 0; p < 4; ++p)
    if (fork() == 0) {
      for (int i = 0; i < 300; ++i) TrovMessage("P ", text.c_str(), 1);
      _exit(0);
    }
  while (wait(nullptr) > 0) {
  }
  std::istringstream in(ReadAll(dir / "shared.log"));
  int count = 0;
  for (std::string line; std::getline(in, line); ++count) ASSERT_EQ(line, "1\tP " + text) << count;
  EXPECT_EQ(count, 1200);
}

}  // namespace
