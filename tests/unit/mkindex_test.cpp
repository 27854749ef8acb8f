// The docuvane-mkindex tool, run as a process.
#include <gtest/gtest.h>
#include <sys/wait.h>

#include <tuple>

#include "test_support.h"

namespace {

using testing_support::ReadAll;
using testing_support::TempDir;

struct Result {
  int status;
  std::string out, err;
};
// Runs the tool; each "@" in `args` stands for the directory `dir` and a slash.
Result RunTool(const TempDir& dir, std::string args) {
  for (std::size_t at; (at = args.find('@')) != std::string::npos;)
    args.replace(at, 1, "'" + dir.path() + "/'");
  const std::string out = dir / "out", err = dir / "err";
  args = "'" DOCUVANE_MKINDEX "' " + args + " >'" + out + "' 2>'" + err + "'";
  const int raw = std::system(args.c_str());
  return {WIFEXITED(raw) ? WEXITSTATUS(raw) : -1, ReadAll(out), ReadAll(err)};
}

TEST(MkIndexTool, WritesBothFormsAndDumpsThemBack) {
  TempDir dir;
  dir.Write("one.listing", "abc\tx.pdf\t7\n");
  ASSERT_EQ(RunTool(dir, "@one.listing @file.Index").status, 0);  // the stored worked example
  EXPECT_EQ(ReadAll(dir / "file.Index"),
            ReadAll(DOCUVANE_FUZZ_CORPUS "/wordindex/worked-example.Index"));
  dir.Write("in.listing",
            "\\section\tbase/usrguide.pdf\t12 15\r\n{align}\tamsldoc.pdf\t3\n\n"
            "\\section\tbase/clsguide.pdf\t4\n\\@ifnextchar\tbase/clsguide.pdf\t9 10\n");
  // Words by length, then in byte order; the lines of a word as listed.
  const std::string dump =
      "{align}\tamsldoc.pdf\t3\n\\section\tbase/usrguide.pdf\t12 15\n"
      "\\section\tbase/clsguide.pdf\t4\n\\@ifnextchar\tbase/clsguide.pdf\t9 10\n";
  for (const std::string form : {"", "--long"}) {
    ASSERT_EQ(RunTool(dir, form + " @in.listing @out.Index").status, 0) << form;
    EXPECT_EQ(RunTool(dir, "--dump @out.Index").out, dump) << form;
  }
}

TEST(MkIndexTool, RefusesBadListingsNamingTheLine) {
  std::string labels;  // 8190 labels, the most an index holds
  for (int i = 1; i <= 8190; ++i) labels += "w\tdoc" + std::to_string(i) + ".pdf\t1\n";
  // listing, message (nullptr: accepted)
  const std::pair<std::string, const char*> rows[] = {
      {"ok\ta.pdf\t1\nnotab\n", "line 2: no tab"},
      {"w\ta.pdf\t1 32768\n", "line 1: page number above 32767"},
      {"w\ta.pdf\t1\n\nw\ta.pdf\t1x\n", "line 3: bad page number"},
      {"w\ta\t1\n" + std::string(256, 'w') + "\ta\t1\n", "line 2: word longer"},
      {"w\t" + std::string(256, 'l') + "\t1\n", "line 1: label longer"},
      {"\ta.pdf\t1\n", "line 1: empty word"},
      {labels + "w\tone-more.pdf\t1\n", "line 8191: too many labels"},
      {labels + std::string(255, 'w') + "\tdoc1.pdf\t32767\n", nullptr},
  };
  for (const auto& [listing, message] : rows) {
    TempDir dir;
    dir.Write("in.listing", listing);
    const Result r = RunTool(dir, "@in.listing @out.Index");
    EXPECT_EQ(r.status, message ? 1 : 0) << r.err;
    EXPECT_NE(r.err.find(message ? message : ""), std::string::npos) << r.err;
    EXPECT_TRUE(message || RunTool(dir, "--dump @out.Index").status == 0);  // it opens
  }
}

}  // namespace
