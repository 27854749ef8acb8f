// The path search and the runtime directory.
#include "trovlib/trovlib.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <sstream>
#include <tuple>

#include "platform/paths.h"
#include "test_support.h"
#include "trovlib/prefetch.h"

namespace {

using testing_support::MessageCapture;
using testing_support::ScopedEnv;
using testing_support::TempDir;

std::string OrNull(const char* s) { return s ? s : "(null)"; }

TEST(TrovSearch, PatternsCategoriesNamesAndTheIndexBuiltOnce) {
  TempDir dir;  // two TeX trees, two icon themes and two PATH directories
  std::istringstream files(
      "A/Docuvane/Docuvane.ini A/Docuvane/sub/deep.txt A/doc/dup.pdf "
      "A/doc/latex/base/guide.pdf A/doc/context/guide.pdf A/doc/a/b/dup.pdf B/doc/only-b.pdf "
      "A/doc/xlatex/base/only.pdf A/Docuvane/logo.png B/Docuvane/logo.xpm bin1/data "
      "t1/16x16/apps/x.png t1/24x24/apps/x.xpm t1/22x22/apps/x.png t1/16x16/apps/small.ico "
      "t1/32x32/apps/small.png A/Docuvane/Upper.BMP t1/24x24/apps/caps.PnG");
  for (std::string rel; files >> rel;) dir.Write(rel, "x");
  for (const char* rel : {"bin1/tool", "bin2/tool", "bin2/only"})
    chmod(dir.Write(rel, "").c_str(), 0755);
  ScopedEnv texmf("TEXMF", dir / "A:" + dir / "B"), path("PATH", dir / "bin1::" + dir / "bin2"),
      themes("TROVLIB_ICON_THEMES", dir / "t1:" + dir / "t2");
  const char* docs = "TeX system documentation";
  const std::tuple<const char*, std::string, const char*> rows[] = {
      // pattern, name, found
      {"$TEXMF/Docuvane//", "Docuvane.ini", "A/Docuvane/Docuvane.ini"},
      {docs, "only-b.pdf", "B/doc/only-b.pdf"},
      {docs, "dup.pdf", "A/doc/dup.pdf"},              // shallower path first
      {docs, "guide.pdf", "A/doc/context/guide.pdf"},  // same depth: byte order
      {docs, "latex\\base/guide.pdf", "A/doc/latex/base/guide.pdf"},
      {docs, "latex/base/only.pdf", nullptr},  // the tail matches whole steps
      {"$TEXMF/Docuvane", "../doc/dup.pdf", nullptr},
      {"Program", "tool", "bin1/tool"},
      {"Program", "data", nullptr},          // not executable
      {"Icon", "x", "t1/24x24/apps/x.xpm"},  // 24, 22, 16, whatever the extension
      {"Icon", "small", "t1/16x16/apps/small.ico"},
      // Icon and logo names match their image extension in any case.
      {"Logo", "Upper", "A/Docuvane/Upper.BMP"},
      {"Logo", "Upper.bmp", "A/Docuvane/Upper.BMP"},
      {"Icon", "caps", "t1/24x24/apps/caps.PnG"},
      {"$TEXMF/Docuvane//", "Upper.bmp", nullptr},  // patterns match names exactly
  };
  // The same answers with the trees' indexes built ahead, on threads.
  for (const bool ahead : {false, true}) {
    TrovResetCaches();
    if (ahead)
      for (const char* spec : {docs, "Icon", "Logo", "$TEXMF/Docuvane//"}) TrovPrefetchSearch(spec);
    for (const auto& [pattern, name, found] : rows)
      EXPECT_EQ(OrNull(TrovSearch(pattern, name.c_str())), found ? dir / found : "(null)")
          << pattern << " " << name << (ahead ? " (built ahead)" : "");
  }
  dir.Write("A/doc/new/later.pdf", "x");
  EXPECT_EQ(OrNull(TrovSearch(docs, "later.pdf")), "(null)") << "not walked again";
  ASSERT_EQ(symlink((dir / "A/doc").c_str(), (dir / "A/doc/a/loop").c_str()), 0);
  TrovResetCaches();
  EXPECT_EQ(OrNull(TrovSearch(docs, "later.pdf")), dir / "A/doc/new/later.pdf");
}

TEST(RuntimeDirectory, CreatedPrivateOrRefused) {
  TempDir dir;
  for (const std::string what : {"missing", "private", "0755", "a file", "a link"}) {
    const std::string base = dir / what, path = base + "/lomari";
    mkdir(base.c_str(), 0700);
    if (what == "private" || what == "0755") mkdir(path.c_str(), 0700);
    if (what == "0755") chmod(path.c_str(), 0755);
    if (what == "a file") dir.Write(what + "/lomari", "x");
    ASSERT_TRUE(what != "a link" || symlink((dir / "private/lomari").c_str(), path.c_str()) == 0);
    const bool accepted = what == "missing" || what == "private";
    ScopedEnv runtime("XDG_RUNTIME_DIR", base);
    MessageCapture capture;
    std::string error = "untouched";
    EXPECT_EQ(RuntimeDirectory(&error), accepted ? path : "") << what;
    EXPECT_EQ(error.rfind(path + ": ", 0) == 0, !accepted) << what << ": " << error;
    EXPECT_TRUE(capture.messages().empty()) << "the platform layer reports nothing itself";
    struct stat st {};
    EXPECT_TRUE(!accepted || (lstat(path.c_str(), &st) == 0 && (st.st_mode & 0777) == 0700))
        << what;
  }
}

}  // namespace
