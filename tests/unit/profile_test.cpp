// Reading INI files with the rules of the Windows profile API.
#include "platform/profile.h"

#include <gtest/gtest.h>
#include <sys/time.h>

#include <string>
#include <vector>

#include "test_support.h"

using namespace std::string_literals;

namespace {

const std::string kIni =
    "; leading comment\n[Setup]\nTrace=2\n  Root  =   D:\\TeX\\%s   \nQuoted=\"  kept blanks  \"\n"
    "Mismatched=\"x'\nLoneQuote=\"\nInner=a \"b\" c\nEmpty=\n;Hidden=yes\nNoEquals\n=no key\n"
    "Dup=first\nDUP=second\nEquals=a=b\nCut=abcdef\n[ Other Section ]\nTrace=9\n"
    "[DOC]\nLaTeX>Guide=g.pdf\nbeta = b\nLATEX>guide=dup\n[Empty]\n[doc]\ngamma=later\n";

TEST(Profile, ValuesListsAndCuts) {
  struct Row {
    const char* what;
    std::string text;
    const char *section, *key;
    std::string expected;  // the bytes before the final NUL
    unsigned long size = 64;
    long count = -1;  // -1: the size of `expected`
  } rows[] = {
      {"section and key ignore case", kIni, "SETUP", "tRaCe", "2"},
      {"blanks around key and value trimmed", kIni, "Setup", "Root", "D:\\TeX\\%s"},
      {"one pair of quotes removed, inner blanks kept", kIni, "Setup", "Quoted", "  kept blanks  "},
      {"mismatched quotes kept", kIni, "Setup", "Mismatched", "\"x'"},
      {"a lone quote kept", kIni, "Setup", "LoneQuote", "\""},
      {"quotes inside kept", kIni, "Setup", "Inner", "a \"b\" c"},
      {"empty value is not the default", kIni, "Setup", "Empty", ""},
      {"comment line is no key", kIni, "Setup", ";Hidden", "dflt"},
      {"line without = is no key", kIni, "Setup", "NoEquals", "dflt"},
      {"first of duplicate keys wins", kIni, "Setup", "dup", "first"},
      {"value holds later =", kIni, "Setup", "Equals", "a=b"},
      {"section name trimmed", kIni, "other section", "trace", "9"},
      {"value exactly size - 1", kIni, "Setup", "Cut", "abcdef", 7},
      {"value cut by one", kIni, "Setup", "Cut", "abcde", 6},
      {"size 1 gives an empty value", kIni, "Setup", "Cut", "", 1},
      {"size 0 writes nothing", kIni, "Setup", "Cut", "", 0},
      {"default cut as well", kIni, "Setup", "none", "df", 3},
      {"keys in order, duplicates once, sections of one name joined", kIni, "doc", nullptr,
       "LaTeX>Guide\0beta\0gamma\0"s},
      {"key list exactly fits", kIni, "DOC", nullptr, "LaTeX>Guide\0beta\0gamma\0"s, 24},
      {"one short: last name cut, two NULs", kIni, "DOC", nullptr, "LaTeX>Guide\0beta\0gamm\0"s, 23,
       21},
      {"room for the first name without its NUL", kIni, "DOC", nullptr, "LaTeX>Guide\0"s, 13, 11},
      {"cut inside the first name", kIni, "DOC", nullptr, "LaT\0"s, 5, 3},
      {"list in size 2", kIni, "DOC", nullptr, "\0"s, 2, 0},
      {"list in size 1", kIni, "DOC", nullptr, "", 1},
      {"list in size 0", kIni, "DOC", nullptr, "", 0},
      {"section without keys", kIni, "Empty", nullptr, "\0"s, 10, 0},
      {"missing section gives the default as a list", kIni, "None", nullptr, "dflt\0"s},
      {"CR LF lines", "[S]\r\nk=v\r\nj=w\r\n", "S", "j", "w"},
      {"no newline at the end", "[S]\nk=last", "S", "k", "last"},
      {"UTF-8 mark before the first section", "\xEF\xBB\xBF[S]\nk=v\n", "S", "k", "v"},
      {"tabs are blanks", "[S]\n\tk\t=\tv\t\n", "S", "k", "v"},
      {"unclosed section header", "[S\nk=v\n", "S", "k", "v"},
      {"keys before any section belong nowhere", "k=v\n[S]\n", "S", "k", "dflt"},
      {"text after a NUL is not read", "[S]\nk=v\n\0j=w\n"s, "S", "j", "dflt"},
      {"8-bit bytes pass through", "[S]\nk=\xE9t\xE9\n", "S", "k", "\xE9t\xE9"},
  };
  for (const auto& row : rows) {
    std::vector<char> buffer(row.size + 1, '#');
    unsigned long n = ProfileStringFromText(row.text.data(), row.text.size(), row.section, row.key,
                                            "dflt", buffer.data(), row.size);
    EXPECT_EQ(buffer[row.size], '#') << row.what << ": wrote past the buffer";
    EXPECT_EQ(n, row.count < 0 ? row.expected.size() : static_cast<std::size_t>(row.count))
        << row.what;
    std::string want = (row.expected + '\0').substr(0, row.size);
    EXPECT_EQ(std::string(buffer.data(), want.size()), want) << row.what;
  }
  char buffer[8];
  ProfileStringFromText(kIni.data(), kIni.size(), "Setup", "none", nullptr, buffer, sizeof buffer);
  EXPECT_STREQ(buffer, "") << "NULL default";
}

TEST(Profile, FilesReadAgainWhenChangedAndBareNames) {
  testing_support::TempDir dir;
  auto value = [](const std::string& file) {
    char buffer[64];
    GetPrivateProfileStringA("S", "k", "<def>", buffer, sizeof buffer, file.c_str());
    return std::string(buffer);
  };
  std::string file = dir.Write("a.ini", "[S]\nk=old\n");
  EXPECT_EQ(value(file), "old");
  dir.Write("a.ini", "[S]\nk=newer\n");
  EXPECT_EQ(value(file), "newer") << "same second, other size";
  dir.Write("a.ini", "[S]\nk=other\n");
  timeval later[2] = {{2000000000, 0}, {2000000000, 0}};
  utimes(file.c_str(), later);
  EXPECT_EQ(value(file), "other") << "same size: the time must tell";
  EXPECT_EQ(value(dir / "missing.ini"), "<def>");
  EXPECT_EQ(value(dir.path()), "<def>") << "a directory is no file";

  dir.Write("etc/Docuvane.ini", "[S]\nk=5\n");
  ProfileSetSystemDirectory((dir / "etc").c_str());
  EXPECT_EQ(value("Docuvane.INI"), "5") << "bare names in the system directory, in any case";
  ProfileSetSystemDirectory(nullptr);
  EXPECT_EQ(value("Docuvane.ini"), "<def>") << "the real system directory has no such file here";
}

}  // namespace
