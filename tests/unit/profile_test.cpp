// Reading INI files with the rules of the Windows profile API, and the
// replay of the parser's fuzz corpus.
#include "platform/profile.h"

#include <gtest/gtest.h>

#include "fuzz/profile_target.h"
#include "test_support.h"

using namespace std::string_literals;

namespace {

const std::string kIni =
    "; comment\n[Setup]\nTrace=2\n  Root  =   D:\\TeX\\%s   \nQuoted=\"  kept blanks  \"\n"
    "Empty=\nNoEquals\n=no key\n"
    "Dup=first\nDUP=second\nCut=abcdef\n[ Other Section ]\nTrace=9\n"
    "[DOC]\nLaTeX>Guide=g.pdf\nbeta = b\nLATEX>guide=dup\n[Empty]\n[doc]\ngamma=later\n";

TEST(Profile, ValuesListsAndCuts) {
  const struct {
    std::string text;
    const char *section, *key;
    std::string expected;  // the bytes before the final NUL
    unsigned long size = 64;
    long count = -1;  // -1: the size of `expected`
  } rows[] = {
      {kIni, "SETUP", "tRaCe", "2"},
      {kIni, "Setup", "Root", "D:\\TeX\\%s"},
      {kIni, "Setup", "Quoted", "  kept blanks  "},
      {kIni, "Setup", "Empty", ""},
      {kIni, "Setup", "dup", "first"},
      {kIni, "other section", "trace", "9"},
      {kIni, "Setup", "Cut", "abcdef", 7},
      {kIni, "Setup", "Cut", "abcde", 6},
      {kIni, "Setup", "none", "df", 3},
      // Key lists: every key line in order (duplicates too), sections of
      // one name joined; a value lookup takes the first duplicate.
      {kIni, "doc", nullptr, "LaTeX>Guide\0beta\0LATEX>guide\0gamma\0"s},
      {kIni, "doc", "latex>GUIDE", "g.pdf"},
      {kIni, "DOC", nullptr, "LaTeX>Guide\0beta\0LATE\0"s, 23, 21},  // cut: two NULs
      {kIni, "DOC", nullptr, "LaTeX>Guide\0"s, 13, 11},
      {kIni, "DOC", nullptr, "LaT\0"s, 5, 3},
      {kIni, "Empty", nullptr, "\0"s, 10, 0},
      {kIni, "None", nullptr, "dflt\0"s},  // the default as a list
      {"[S]\r\nk=v\r\nj=w\r\n", "S", "j", "w"},
      {"k=v\n[S]\n", "S", "k", "dflt"},
      {"[S]\nk=v\n\0j=w\n"s, "S", "j", "dflt"},
  };
  for (const auto& row : rows) {
    const std::string what = std::string(row.section) + "/" + (row.key ? row.key : "(list)") +
                             " in " + std::to_string(row.size);
    std::vector<char> buffer(row.size + 1, '#');
    unsigned long n = ProfileStringFromText(row.text.data(), row.text.size(), row.section, row.key,
                                            "dflt", buffer.data(), row.size);
    EXPECT_EQ(buffer[row.size], '#') << what << ": wrote past the buffer";
    EXPECT_EQ(n, row.count < 0 ? row.expected.size() : std::size_t(row.count)) << what;
    std::string want = (row.expected + '\0').substr(0, row.size);
    EXPECT_EQ(std::string(buffer.data(), want.size()), want) << what;
  }
}

// A batch checks each file once; before and after it every lookup sees the
// file as it is (a batch left open would serve stale values for good).
TEST(Profile, ABatchChecksEachFileOnce) {
  testing_support::TempDir dir;
  const std::string file = dir.Write("a.ini", "[S]\nk=one\n");
  const std::string missing = dir / "later.ini";
  auto read = [](const std::string& path) {
    char value[16];
    GetPrivateProfileStringA("S", "k", "none", value, sizeof value, path.c_str());
    return std::string(value);
  };
  EXPECT_EQ(read(file), "one");
  {
    ProfileBatch batch;
    EXPECT_EQ(read(file), "one");
    EXPECT_EQ(read(missing), "none");
    dir.Write("a.ini", "[S]\nk=second\n");
    dir.Write("later.ini", "[S]\nk=new\n");
    ProfileBatch inner;
    EXPECT_EQ(read(file), "one");
    EXPECT_EQ(read(missing), "none");
  }
  EXPECT_EQ(read(file), "second");
  EXPECT_EQ(read(missing), "new");
}

TEST(ProfileFuzzReplay, EveryCorpusInputRuns) {
  int replayed = 0;
  for (const auto& entry : std::filesystem::directory_iterator(DOCUVANE_FUZZ_CORPUS "/profile")) {
    const std::string text = testing_support::ReadAll(entry.path());
    for (const char* section : {"setup", "DOC", "", "a", static_cast<const char*>(nullptr)})
      for (const char* key : {"TRACE", "root", "a", "", static_cast<const char*>(nullptr)})
        for (unsigned long size : {0, 1, 2, 3, 9, 31, 300})
          FuzzProfileLookup(text.data(), text.size(), section, key, size);
    ++replayed;
  }
  EXPECT_GE(replayed, 5);
}

}  // namespace
