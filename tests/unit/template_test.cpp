// Opening templates: Root expansion and the command grammar, command line
// and argument vector side by side.
#include "access/template.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace {

using Args = std::vector<std::string>;

TEST(TemplateRoot, ExpandsOnlyTwoStringsAndPercent) {
  struct Row {
    const char *what, *tmpl, *root, *expected;
  } rows[] = {
      {"first and second %s", "%s/v -r %s", "/r", "/r/v -r /r"},
      {"a third %s stays", "%s %s %s", "/r", "/r /r %s"},
      {"%% gives %", "100%% ^", "/r", "100% ^"},
      {"%%s is a percent and an s", "%%s", "/r", "%s"},
      {"other conversions are copied", "%d %x %n %p %5s", "/r", "%d %x %n %p %5s"},
      {"a lone % at the end", "v %", "/r", "v %"},
      {"lone %s with empty root is empty", "%s", "", ""},
      {"root holding % is not read again", "%s", "%s%n", "%s%n"},
  };
  for (const Row& row : rows)
    EXPECT_EQ(ExpandTemplateRoot(row.tmpl, row.root), row.expected) << row.what;
}

TEST(TemplateGrammar, EveryRowWithAndWithoutAnchor) {
  const std::string p40(40, 'p'), p31(31, 'p');
  struct Row {
    const char* what;
    std::string tmpl;
    const char* anchor;
    const char* document;
    std::string commandLine;
    Args argv;
  } rows[] = {
      // clang-format off
      {"^ is the name up to its last dot", "^", "5", "/t/a.b/c.d.pdf", "/t/a.b/c.d",
       {"/t/a.b/c.d"}},
      {"^ acts inside a skipped section", "{^}", nullptr, "/t/g.dvi", "/t/g", {"/t/g"}},
      {"# inserts the whole anchor", "-p #", "page=12 15 ", "/t/g.pdf", "-p page=12 15 ",
       {"-p", "page=12 15 "}},
      {"# without anchor inserts nothing", "-p #", nullptr, "/t/g.pdf", "-p ", {"-p"}},
      {"# with an empty anchor inserts nothing", "-p #", "", "/t/g.pdf", "-p ", {"-p"}},
      {"# acts inside braces with an anchor", "{#}", "7", "/t/g.pdf", "7", {"7"}},
      {"braces vanish with an anchor", "{a}b", "1", "/t/g.pdf", "ab", {"ab"}},
      {"braces skip literals without anchor", "{a}b", nullptr, "/t/g.pdf", "b", {"b"}},
      {"nested braces", "{a{b}c}d", nullptr, "/t/g.pdf", "d", {"d"}},
      {"unmatched } makes the depth negative", "}ab{c}d", nullptr, "/t/g.pdf", "c", {"c"}},
      {"unmatched } is harmless with an anchor", "}ab", "1", "/t/g.pdf", "ab", {"ab"}},
      {"~ copies the next character", "~#~^~{", nullptr, "/t/g.pdf", "#^{", {"#^{"}},
      {"~<x is the literal <x", "~<x", "1", "/t/g.pdf", "<x", {"<x"}},
      {"{~}x without anchor gives x", "{~}x", nullptr, "/t/g.pdf", "x", {"x"}},
      {"{~}x with an anchor gives }x", "{~}x", "1", "/t/g.pdf", "}x", {"}x"}},
      {"~# with an anchor is a literal #", "{~#}", "5", "/t/g.pdf", "#", {"#"}},
      {"~ inside braces drops, then # acts", "{~#}", nullptr, "/t/g.pdf", "", {}},
      {"~ at depth then a skipped literal", "{~a}b", nullptr, "/t/g.pdf", "b", {"b"}},
      {"a trailing ~ ends the template", "ab~", "1", "/t/g.pdf", "ab", {"ab"}},
      {"escaped blank stays in the argument", "a~ b", nullptr, "/t/g.pdf", "a b", {"a b"}},
      {"escaped quote is a character", "a~\"b", nullptr, "/t/g.pdf", "a\"b", {"a\"b"}},
      {"program path", "<viewer.exe>", nullptr, "/t/g.pdf", "/bin/viewer.exe", {"/bin/viewer.exe"}},
      {"program path with a blank is one argument", "<my viewer> ^", nullptr, "/t/g.pdf",
       "/opt/my viewer/run /t/g", {"/opt/my viewer/run", "/t/g"}},
      {"program not found keeps its slot", "<nothere> ^.pdf", nullptr, "/t/g.pdf", " /t/g.pdf",
       {"", "/t/g.pdf"}},
      {"program name cut to 31", "<" + p40 + ">", nullptr, "/t/g.pdf", "/P31", {"/P31"}},
      {"no > ends the template after the path", "<viewer.exe ^", nullptr, "/t/g.pdf", "", {""}},
      {"no > with a known name", "<viewer.exe", nullptr, "/t/g.pdf", "/bin/viewer.exe",
       {"/bin/viewer.exe"}},
      {"program acts inside a skipped section", "{<viewer.exe>}", nullptr, "/t/g.pdf",
       "/bin/viewer.exe", {"/bin/viewer.exe"}},
      {"blanks separate", "a  b\tc", nullptr, "/t/g.pdf", "a  b\tc", {"a", "b", "c"}},
      {"quotes group", "\"a b\" c", nullptr, "/t/g.pdf", "\"a b\" c", {"a b", "c"}},
      {"empty quotes are an empty argument", "a \"\" b", nullptr, "/t/g.pdf", "a \"\" b",
       {"a", "", "b"}},
      {"quoted insertion", "\"^.pdf\"", nullptr, "/t/my g.pdf", "\"/t/my g.pdf\"", {"/t/my g.pdf"}},
      {"skipped blanks do not separate", "a{ }b", nullptr, "/t/g.pdf", "ab", {"ab"}},
      {"unclosed quote ends with the template", "\"a b", nullptr, "/t/g.pdf", "\"a b", {"a b"}},
      {"example with anchor", "<viewer.exe>{ -p #} ^.dvi", "5", "C:\\tex\\guide.dvi",
       "/bin/viewer.exe -p 5 C:\\tex\\guide.dvi",
       {"/bin/viewer.exe", "-p", "5", "C:\\tex\\guide.dvi"}},
      {"example without anchor", "<viewer.exe>{ -p #} ^.dvi", nullptr, "C:\\tex\\guide.dvi",
       "/bin/viewer.exe C:\\tex\\guide.dvi", {"/bin/viewer.exe", "C:\\tex\\guide.dvi"}},
      {"quote and blanks in the name", "<viewer.exe> ^.dvi", nullptr, "/t/a\" -x=1 \"b.dvi",
       "/bin/viewer.exe /t/a\" -x=1 \"b.dvi", {"/bin/viewer.exe", "/t/a\" -x=1 \"b.dvi"}},
      {"anchor with quotes and blanks", "-p #", "a\" \"b c", "/t/g.pdf", "-p a\" \"b c",
       {"-p", "a\" \"b c"}},
      {"anchor next to literal text", "x#y", "1 2", "/t/g.pdf", "x1 2y", {"x1 2y"}},
      // clang-format on
  };
  auto findProgram = [&](const std::string& name) -> std::string {
    if (name == "viewer.exe") return "/bin/viewer.exe";
    if (name == "my viewer") return "/opt/my viewer/run";
    return name == p31 ? "/P31" : "";
  };
  for (const Row& row : rows) {
    TemplateCommand command =
        BuildTemplateCommand(row.tmpl, row.document, row.anchor, findProgram, false);
    EXPECT_EQ(command.commandLine, row.commandLine) << row.what;
    EXPECT_EQ(command.argv, row.argv) << row.what;
  }
}

}  // namespace
