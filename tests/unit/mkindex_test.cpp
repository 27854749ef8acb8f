// The docuvane-mkindex tool, run as a process.
#include <gtest/gtest.h>
#include <sys/wait.h>

#include <cstdlib>
#include <fstream>
#include <iterator>
#include <sstream>
#include <string>
#include <vector>

#include "test_support.h"

using testing_support::TempDir;

namespace {

std::string ReadAll(const std::string& path) {
  std::ifstream in(path, std::ios::binary);
  return std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

std::string Quote(const std::string& s) {
  std::string out = "'";
  for (char c : s) out += (c == '\'') ? std::string("'\\''") : std::string(1, c);
  return out + "'";
}

struct Result {
  int status;
  std::string out;
  std::string err;
};

Result RunTool(const TempDir& dir, const std::string& args) {
  const std::string out = dir / "stdout";
  const std::string err = dir / "stderr";
  const std::string command =
      Quote(DOCUVANE_MKINDEX) + " " + args + " >" + Quote(out) + " 2>" + Quote(err);
  const int raw = std::system(command.c_str());
  return {WIFEXITED(raw) ? WEXITSTATUS(raw) : -1, ReadAll(out), ReadAll(err)};
}

TEST(MkIndexTool, WorkedExampleBytes) {
  TempDir dir;
  const std::string listing = dir.Write("one.listing", "abc\tx.pdf\t7\n");
  Result r = RunTool(dir, Quote(listing) + " " + Quote(dir / "command.Index"));
  ASSERT_EQ(r.status, 0) << r.err;
  const std::string expected(
      "\x57\x58\x03\x03\x00\x00\x00\x14\x00\x00\x00\x1C\x00\x01\x00\x00\x27\x00\x00\x2C"
      "\x61\x62\x63\x00\x00\x00\x1C\x00\x03\x00\x00\x04\x61\x62\x63\x80\x01\x00\x07"
      "\x78\x2E\x70\x64\x66",
      44);
  EXPECT_EQ(ReadAll(dir / "command.Index"), expected);

  // The same listing from standard input.
  r = RunTool(dir, "- " + Quote(dir / "stdin.Index") + " <" + Quote(listing));
  ASSERT_EQ(r.status, 0) << r.err;
  EXPECT_EQ(ReadAll(dir / "stdin.Index"), expected);
}

TEST(MkIndexTool, LongFormAndDumpRoundTrip) {
  TempDir dir;
  const std::string listing = dir.Write("in.listing",
                                        "\\section\tlatex/base/usrguide.pdf\t12 15\r\n"
                                        "{align}\tlatex/amsmath/amsldoc.pdf\t3\n"
                                        "\n"
                                        "\\section\tlatex/base/clsguide.pdf\t4\n"
                                        "\\@ifnextchar\tlatex/base/clsguide.pdf\t9 10\n");
  for (const char* form : {"", "--long "}) {
    const std::string index = dir / "out.Index";
    Result r = RunTool(dir, form + Quote(listing) + " " + Quote(index));
    ASSERT_EQ(r.status, 0) << form << r.err;
    r = RunTool(dir, "--dump " + Quote(index));
    ASSERT_EQ(r.status, 0) << form << r.err;
    // Words by length, then in byte order; the lines of a word as listed.
    EXPECT_EQ(r.out,
              "{align}\tlatex/amsmath/amsldoc.pdf\t3\n"
              "\\section\tlatex/base/usrguide.pdf\t12 15\n"
              "\\section\tlatex/base/clsguide.pdf\t4\n"
              "\\@ifnextchar\tlatex/base/clsguide.pdf\t9 10\n")
        << form;
    // The dump rebuilds an index that dumps the same.
    const std::string dumped = r.out;
    const std::string again = dir.Write("again.listing", dumped);
    ASSERT_EQ(RunTool(dir, form + Quote(again) + " " + Quote(dir / "again.Index")).status, 0);
    EXPECT_EQ(RunTool(dir, "--dump " + Quote(dir / "again.Index")).out, dumped) << form;
  }
  // The long form has no way to write a location without pages.
  const std::string bare = dir.Write("bare.listing", "w\ta.pdf\t\n");
  EXPECT_EQ(RunTool(dir, Quote(bare) + " " + Quote(dir / "bare.Index")).status, 0);
  Result r = RunTool(dir, "--long " + Quote(bare) + " " + Quote(dir / "bare.Index"));
  EXPECT_NE(r.status, 0);
  EXPECT_NE(r.err.find("without pages"), std::string::npos) << r.err;
}

TEST(MkIndexTool, BadListingsNameTheLine) {
  std::string manyLabels;
  for (int i = 0; i <= 8190; ++i) manyLabels += "w\tdoc" + std::to_string(i) + ".pdf\t1\n";
  struct Row {
    const char* what;
    std::string listing;
    std::string message;
  };
  const Row rows[] = {
      {"no tab", "ok\ta.pdf\t1\nnotab\n", "line 2: no tab"},
      {"page above 32767", "w\ta.pdf\t1 32768\n", "line 1: page number above 32767"},
      {"page not a number", "w\ta.pdf\t1\n\nw\ta.pdf\t1x\n", "line 3: bad page number"},
      {"word over 255 bytes", "w\ta\t1\n" + std::string(256, 'w') + "\ta.pdf\t1\n",
       "line 2: word longer than 255 bytes"},
      {"label over 255 bytes", "w\t" + std::string(256, 'l') + "\t1\n",
       "line 1: label longer than 255 bytes"},
      {"empty word", "\ta.pdf\t1\n", "line 1: empty word"},
      {"too many labels", manyLabels, "line 8191: too many labels"},
  };
  for (const Row& row : rows) {
    TempDir dir;
    const std::string listing = dir.Write("bad.listing", row.listing);
    Result r = RunTool(dir, Quote(listing) + " " + Quote(dir / "bad.Index"));
    EXPECT_EQ(r.status, 1) << row.what;
    EXPECT_NE(r.err.find(row.message), std::string::npos) << row.what << ": " << r.err;
  }
  // 8190 labels and a word of 255 bytes are still fine.
  TempDir dir;
  manyLabels.erase(manyLabels.rfind("w\t"));
  const std::string listing =
      dir.Write("fine.listing", manyLabels + std::string(255, 'w') + "\tdoc0.pdf\t32767\n");
  Result r = RunTool(dir, Quote(listing) + " " + Quote(dir / "fine.Index"));
  EXPECT_EQ(r.status, 0) << r.err;
}

TEST(MkIndexTool, UsageAndUnreadableIndex) {
  TempDir dir;
  EXPECT_EQ(RunTool(dir, "").status, 2);
  EXPECT_EQ(RunTool(dir, "--long onlyone").status, 2);
  const std::string junk = dir.Write("junk.Index", "not an index");
  Result r = RunTool(dir, "--dump " + Quote(junk));
  EXPECT_EQ(r.status, 1);
  EXPECT_NE(r.err.find("Invalid signature"), std::string::npos) << r.err;
}

}  // namespace
