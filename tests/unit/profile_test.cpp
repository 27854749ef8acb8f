// Reading INI files with the rules of the Windows profile API.
#include <sys/stat.h>
#include <sys/time.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "platform/profile.h"
#include "test_support.h"

using testing_support::TempDir;

namespace {

struct Answer {
  unsigned long count;
  std::string bytes;  // the buffer up to two bytes past the count
};

// Reads through the file API, into a buffer of `size` with a guard byte.
Answer Read(const std::string& file, const char* section, const char* key, const char* def,
            unsigned long size) {
  std::vector<char> buffer(size + 1, '#');
  unsigned long n = GetPrivateProfileStringA(section, key, def, buffer.data(), size, file.c_str());
  EXPECT_EQ(buffer[size], '#') << "wrote past the buffer";
  std::size_t used = std::min<std::size_t>(size, n + 2);
  return {n, std::string(buffer.data(), used)};
}

std::string Value(const std::string& file, const char* section, const char* key,
                  const char* def = "<def>", unsigned long size = 128) {
  char buffer[512];
  GetPrivateProfileStringA(section, key, def, buffer, size, file.c_str());
  return buffer;
}

const char kSample[] =
    "; leading comment\n"
    "[Setup]\n"
    "Trace=2\n"
    "  Root  =   D:\\TeX\\%s   \n"
    "Quoted=\"  kept blanks  \"\n"
    "Mismatched=\"x'\n"
    "LoneQuote=\"\n"
    "Inner=a \"b\" c\n"
    "Empty=\n"
    ";Hidden=yes\n"
    "NoEquals\n"
    "=no key\n"
    "Dup=first\n"
    "DUP=second\n"
    "Equals=a=b\n"
    "[ Other Section ]\n"
    "Trace=9\n";

TEST(Profile, ValueLookupRules) {
  TempDir dir;
  std::string file = dir.Write("a.ini", kSample);
  ProfileCacheClear();
  struct Row {
    const char* what;
    const char* section;
    const char* key;
    const char* expected;
  } rows[] = {
      {"plain value", "Setup", "Trace", "2"},
      {"section and key ignore case", "SETUP", "tRaCe", "2"},
      {"blanks around key and value trimmed", "Setup", "Root", "D:\\TeX\\%s"},
      {"one pair of double quotes removed, inner blanks kept", "Setup", "Quoted", "  kept blanks  "},
      {"mismatched quotes kept", "Setup", "Mismatched", "\"x'"},
      {"a lone quote kept", "Setup", "LoneQuote", "\""},
      {"quotes inside kept", "Setup", "Inner", "a \"b\" c"},
      {"empty value is not the default", "Setup", "Empty", ""},
      {"comment line is no key", "Setup", ";Hidden", "<def>"},
      {"line without = is no key", "Setup", "NoEquals", "<def>"},
      {"first of duplicate keys wins", "Setup", "dup", "first"},
      {"value holds later =", "Setup", "Equals", "a=b"},
      {"section name trimmed", "other section", "trace", "9"},
      {"missing key", "Setup", "Missing", "<def>"},
  };
  for (const auto& row : rows) EXPECT_EQ(Value(file, row.section, row.key), row.expected) << row.what;
  EXPECT_EQ(Value(dir / "missing.ini", "Setup", "Trace"), "<def>") << "missing file";
  EXPECT_EQ(Value(dir.path(), "Setup", "Trace"), "<def>") << "a directory is no file";
  EXPECT_EQ(Value(file, "Setup", "Missing", nullptr), "") << "NULL default";
}

TEST(Profile, BuffersAreCutToSizeLessOne) {
  TempDir dir;
  std::string file = dir.Write("a.ini", "[S]\nk=abcdef\n");
  struct Row {
    const char* what;
    const char* key;
    unsigned long size;
    unsigned long count;
    std::string bytes;
  } rows[] = {
      {"fits", "k", 8, 6, std::string("abcdef\0", 7)},
      {"exactly size - 1", "k", 7, 6, std::string("abcdef\0", 7)},
      {"cut by one", "k", 6, 5, std::string("abcde\0", 6)},
      {"size 1 gives an empty string", "k", 1, 0, std::string("\0", 1)},
      {"size 0 writes nothing", "k", 0, 0, ""},
      {"default cut as well", "none", 3, 2, std::string("de\0", 3)},
  };
  for (const auto& row : rows) {
    Answer a = Read(file, "S", row.key, "default", row.size);
    EXPECT_EQ(a.count, row.count) << row.what;
    EXPECT_EQ(a.bytes.substr(0, std::min(a.bytes.size(), row.bytes.size())), row.bytes) << row.what;
  }
}

TEST(Profile, KeyNamesInFileOrder) {
  TempDir dir;
  std::string file = dir.Write("a.ini",
                               "[DOC]\nLaTeX>Guide=g.pdf\nbeta = b\nLATEX>guide=dup\n[Empty]\n"
                               "[doc]\ngamma=later section of the same name\n");
  struct Row {
    const char* what;
    const char* section;
    unsigned long size;
    unsigned long count;
    std::string bytes;
  } rows[] = {
      {"all keys, duplicates once, sections of one name joined", "doc", 100, 23,
       std::string("LaTeX>Guide\0beta\0gamma\0\0", 24)},
      {"exactly fits", "DOC", 24, 23, std::string("LaTeX>Guide\0beta\0gamma\0\0", 24)},
      {"one short: last name cut, two NULs", "DOC", 23, 21, std::string("LaTeX>Guide\0beta\0gamm\0\0", 23)},
      {"cut inside the first name", "DOC", 5, 3, std::string("LaT\0\0", 5)},
      {"room for the first name only, without its NUL", "DOC", 13, 11,
       std::string("LaTeX>Guide\0\0", 13)},
      {"size 2", "DOC", 2, 0, std::string("\0\0", 2)},
      {"size 1", "DOC", 1, 0, std::string("\0", 1)},
      {"size 0", "DOC", 0, 0, ""},
      {"section without keys", "Empty", 10, 0, std::string("\0\0", 2)},
      {"missing section gives the default as a list", "None", 10, 5, std::string("dflt\0\0", 6)},
  };
  for (const auto& row : rows) {
    Answer a = Read(file, row.section, nullptr, "dflt", row.size);
    EXPECT_EQ(a.count, row.count) << row.what;
    EXPECT_EQ(a.bytes.substr(0, row.bytes.size()), row.bytes) << row.what;
  }
}

TEST(Profile, LineEndsAndOddBytes) {
  struct Row {
    const char* what;
    std::string text;
    const char* key;
    const char* expected;
  } rows[] = {
      {"CR LF lines", "[S]\r\nk=v\r\nj=w\r\n", "k", "v"},
      {"CR LF: the value carries no CR", "[S]\r\nk=v\r\nj=w\r\n", "j", "w"},
      {"no newline at the end", "[S]\nk=last", "k", "last"},
      {"UTF-8 mark before the first section", "\xEF\xBB\xBF[S]\nk=v\n", "k", "v"},
      {"tabs are blanks", "[S]\n\tk\t=\tv\t\n", "k", "v"},
      {"unclosed section header", "[S\nk=v\n", "k", "v"},
      {"keys before any section belong nowhere", "k=v\n[S]\n", "k", "<def>"},
      {"text after a NUL is not read", std::string("[S]\nk=v\n\0j=w\n", 14), "j", "<def>"},
      {"text before a NUL is", std::string("[S]\nk=v\n\0j=w\n", 14), "k", "v"},
      {"8-bit bytes pass through", "[S]\nk=\xE9t\xE9\n", "k", "\xE9t\xE9"},
  };
  for (const auto& row : rows) {
    char buffer[64];
    ProfileStringFromText(row.text.data(), row.text.size(), "S", row.key, "<def>", buffer, sizeof buffer);
    EXPECT_STREQ(buffer, row.expected) << row.what;
  }
}

TEST(Profile, FileIsReadAgainWhenItChanges) {
  TempDir dir;
  std::string file = dir.Write("a.ini", "[S]\nk=old\n");
  EXPECT_EQ(Value(file, "S", "k"), "old");
  dir.Write("a.ini", "[S]\nk=newer\n");  // same second, other size
  EXPECT_EQ(Value(file, "S", "k"), "newer");
  dir.Write("a.ini", "[S]\nk=other\n");  // same size: the time must tell
  timeval later[2] = {{2000000000, 0}, {2000000000, 0}};
  utimes(file.c_str(), later);
  EXPECT_EQ(Value(file, "S", "k"), "other");
}

TEST(Profile, BareNameIsLookedUpInTheSystemDirectory) {
  TempDir dir;
  dir.Write("etc/Docuvane.ini", "[Setup]\nTrace=5\n");
  ProfileSetSystemDirectory((dir / "etc").c_str());
  EXPECT_EQ(Value("Docuvane.ini", "Setup", "Trace"), "5");
  EXPECT_EQ(Value("Docuvane.INI", "Setup", "Trace"), "5") << "the name's case does not matter";
  EXPECT_EQ(Value("Other.ini", "Setup", "Trace"), "<def>");
  ProfileSetSystemDirectory(nullptr);
  EXPECT_EQ(Value("Docuvane.ini", "Setup", "Trace", "<def>"), "<def>")
      << "the real system directory has no such file here";
}

}  // namespace
