// The TeX tree's ls-R database in place of a walk: its rules, and the walk
// whenever it may not tell the whole truth.
#include "trovlib/lsr.h"

#include <gtest/gtest.h>

#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <functional>
#include <string>
#include <thread>
#include <vector>

#include "test_support.h"
#include "trovlib/trovlib.h"

namespace {

namespace fs = std::filesystem;
const std::string kMagic = "% ls-R -- filename database for kpathsea; do not change this line.\n";

// A tree with doc/a/x.pdf, doc/b/x.pdf, doc/b/c/x.pdf, doc/y.pdf and an ls-R
// above doc that lists them all; `Finish` writes the ls-R a few clock ticks
// after the tree's last change, so that it is current unless the case
// changes the tree later.
struct Tree {
  testing_support::TempDir dir;
  std::string lsr = kMagic +
                    "./:\ndoc\nls-R\n\n./doc:\na\nb\ny.pdf\n\n./doc/a:\nx.pdf\n\n"
                    "./doc/b:\nc\nx.pdf\n\n./doc/b/c:\nx.pdf\n";
  Tree() {
    for (const char* f : {"doc/a/x.pdf", "doc/b/x.pdf", "doc/b/c/x.pdf", "doc/y.pdf"})
      dir.Write(f, "%PDF");
  }
  void Finish() {
    std::this_thread::sleep_for(std::chrono::milliseconds(20));
    dir.Write("ls-R", lsr);
  }
  std::string Root() const { return dir / "doc"; }
};

struct Case {
  const char* name;
  std::function<void(Tree&)> before;  // changes before the ls-R is written
  std::function<void(Tree&)> after;   // changes after it
  bool read;                          // the database is used
};

void Nothing(Tree&) {}

TEST(LsR, UsedOnlyWhenComplete) {
  const std::vector<Case> cases = {
      {"current", Nothing, Nothing, true},
      {"old first line", [](Tree& t) { t.lsr = "% ls-R\n" + t.lsr.substr(kMagic.size()); }, Nothing,
       false},
      {"older magic line",
       [](Tree& t) {
         t.lsr = "% ls-R -- maintained by MakeTeXls-R; do not change this line.\n" +
                 t.lsr.substr(kMagic.size());
       },
       Nothing, true},
      {"root not listed", [](Tree& t) { t.lsr = kMagic + "./:\ndoc\n"; }, Nothing, false},
      {"absolute sections", [](Tree& t) { t.lsr = kMagic + "/elsewhere/doc:\ny.pdf\n"; }, Nothing,
       false},
      {"file added later", Nothing, [](Tree& t) { t.dir.Write("doc/a/new.pdf", "%PDF"); }, false},
      {"directory added later", Nothing, [](Tree& t) { t.dir.Write("doc/b/c/d/new.pdf", "%PDF"); },
       false},
      {"listed directory removed", Nothing, [](Tree& t) { fs::remove_all(t.dir / "doc/b/c"); },
       false},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.name);
    Tree tree;
    c.before(tree);
    tree.Finish();
    c.after(tree);
    std::vector<std::string> files;
    ASSERT_EQ(trovlib::ReadCurrentLsR(tree.Root(), files), c.read);
    if (!c.read) continue;
    // The walk's order: shallower first, then by the steps' byte order.
    const std::string doc = tree.Root() + "/";
    EXPECT_EQ(files, (std::vector<std::string>{doc + "y.pdf", doc + "a/x.pdf", doc + "b/x.pdf",
                                               doc + "b/c/x.pdf"}));
  }
}

TEST(LsR, NoDatabaseOrAnOlderOneMeansWalking) {
  Tree tree;
  std::vector<std::string> files;
  EXPECT_FALSE(trovlib::ReadCurrentLsR(tree.Root(), files));
  tree.Finish();
  EXPECT_TRUE(trovlib::ReadCurrentLsR(tree.Root(), files));
  // Dated back to before the tree's last change (or in the same tick).
  fs::last_write_time(tree.dir / "ls-R", fs::file_time_type::clock::now() - std::chrono::hours(1));
  EXPECT_FALSE(trovlib::ReadCurrentLsR(tree.Root(), files));
}

// What the search answers: the database's files while it is current; once
// stale, the walk's, so that a file added since is found.
TEST(LsR, SearchTrustsACurrentDatabaseAndWalksAStaleOne) {
  Tree tree;
  tree.lsr += "\n./doc/a:\nonly-listed.pdf\n";
  tree.Finish();
  setenv("TEXMF", tree.dir.path().c_str(), 1);
  TrovResetCaches();
  const char* listed = TrovSearch(kDocumentationCategory, "only-listed.pdf");
  EXPECT_STREQ(listed, (tree.Root() + "/a/only-listed.pdf").c_str());
  EXPECT_STREQ(TrovSearch(kDocumentationCategory, "x.pdf"), (tree.Root() + "/a/x.pdf").c_str());

  tree.dir.Write("doc/b/c/added.pdf", "%PDF");
  TrovResetCaches();
  EXPECT_STREQ(TrovSearch(kDocumentationCategory, "added.pdf"),
               (tree.Root() + "/b/c/added.pdf").c_str());
  EXPECT_EQ(TrovSearch(kDocumentationCategory, "only-listed.pdf"), nullptr);
  unsetenv("TEXMF");
  TrovResetCaches();
}

}  // namespace
