// Opening templates: Root expansion and the command grammar, command line
// and argument vector side by side.
#include "access/template.h"

#include <gtest/gtest.h>

#include <optional>
#include <string>
#include <vector>

#include "test_support.h"

namespace {

using Args = std::vector<std::string>;

std::string FakeProgram(const std::string& name) {
  if (name == "viewer.exe") return "/bin/viewer.exe";
  if (name == "my viewer") return "/opt/my viewer/run";
  return "";
}

TEST(TemplateRoot, ExpandsOnlyTwoStringsAndPercent) {
  struct Row {
    const char* what;
    const char* tmpl;
    const char* root;
    const char* expected;
  } rows[] = {
      {"first %s", "%s/bin/v ^.dvi", "/opt/tex", "/opt/tex/bin/v ^.dvi"},
      {"second %s", "%s/v -r %s", "/r", "/r/v -r /r"},
      {"a third %s stays", "%s %s %s", "/r", "/r /r %s"},
      {"%% gives %", "100%% ^", "/r", "100% ^"},
      {"%%s is a percent and an s", "%%s", "/r", "%s"},
      {"other conversions are copied", "%d %x %n %p %5s", "/r", "%d %x %n %p %5s"},
      {"a lone % at the end", "v %", "/r", "v %"},
      {"lone %s with empty root is empty", "%s", "", ""},
      {"root holding % is not read again", "%s", "%s%n", "%s%n"},
      {"empty template", "", "/r", ""},
  };
  for (const Row& row : rows)
    EXPECT_EQ(ExpandTemplateRoot(row.tmpl, row.root), row.expected) << row.what;
}

TEST(TemplateGrammar, EveryRowWithAndWithoutAnchor) {
  struct Row {
    const char* what;
    const char* tmpl;
    std::optional<std::string> anchor;
    const char* document;
    std::string commandLine;
    Args argv;
  } rows[] = {
      // "^"
      {"^ is the name up to its last dot", "^", "5", "/t/guide.dvi", "/t/guide", {"/t/guide"}},
      {"^ without anchor the same", "^.dvi", std::nullopt, "/t/guide.dvi", "/t/guide.dvi", {"/t/guide.dvi"}},
      {"^ uses the last dot", "^", std::nullopt, "/t/a.b/c.d.pdf", "/t/a.b/c.d", {"/t/a.b/c.d"}},
      {"^ acts inside a skipped section", "{^}", std::nullopt, "/t/g.dvi", "/t/g", {"/t/g"}},
      // "#"
      {"# inserts the whole anchor", "-p #", "page=12 15 ", "/t/g.pdf", "-p page=12 15 ", {"-p", "page=12 15 "}},
      {"# without anchor inserts nothing", "-p #", std::nullopt, "/t/g.pdf", "-p ", {"-p"}},
      {"# with an empty anchor inserts nothing", "-p #", "", "/t/g.pdf", "-p ", {"-p"}},
      {"# acts inside braces with an anchor", "{#}", "7", "/t/g.pdf", "7", {"7"}},
      // "{" and "}"
      {"braces vanish with an anchor", "{a}b", "1", "/t/g.pdf", "ab", {"ab"}},
      {"braces skip literals without anchor", "{a}b", std::nullopt, "/t/g.pdf", "b", {"b"}},
      {"nested braces", "{a{b}c}d", std::nullopt, "/t/g.pdf", "d", {"d"}},
      {"unmatched } makes the depth negative", "}ab{c}d", std::nullopt, "/t/g.pdf", "c", {"c"}},
      {"unmatched } is harmless with an anchor", "}ab", "1", "/t/g.pdf", "ab", {"ab"}},
      // "~"
      {"~ copies the next character", "~#~^~{", std::nullopt, "/t/g.pdf", "#^{", {"#^{"}},
      {"~<x is the literal <x", "~<x", "1", "/t/g.pdf", "<x", {"<x"}},
      {"~<x without anchor too", "~<x", std::nullopt, "/t/g.pdf", "<x", {"<x"}},
      {"{~}x without anchor gives x", "{~}x", std::nullopt, "/t/g.pdf", "x", {"x"}},
      {"{~}x with an anchor gives }x", "{~}x", "1", "/t/g.pdf", "}x", {"}x"}},
      {"~# with an anchor is a literal #", "{~#}", "5", "/t/g.pdf", "#", {"#"}},
      {"~ inside braces drops, then # acts", "{~#}", std::nullopt, "/t/g.pdf", "", {}},
      {"~ at depth then a skipped literal", "{~a}b", std::nullopt, "/t/g.pdf", "b", {"b"}},
      {"a trailing ~ ends the template", "ab~", "1", "/t/g.pdf", "ab", {"ab"}},
      {"escaped blank stays in the argument", "a~ b", std::nullopt, "/t/g.pdf", "a b", {"a b"}},
      {"escaped quote is a character", "a~\"b", std::nullopt, "/t/g.pdf", "a\"b", {"a\"b"}},
      // "<name>"
      {"program path", "<viewer.exe>", std::nullopt, "/t/g.pdf", "/bin/viewer.exe", {"/bin/viewer.exe"}},
      {"program path with a blank is one argument", "<my viewer> ^", std::nullopt, "/t/g.pdf",
       "/opt/my viewer/run /t/g", {"/opt/my viewer/run", "/t/g"}},
      {"program not found keeps its slot", "<nothere> ^.pdf", std::nullopt, "/t/g.pdf", " /t/g.pdf",
       {"", "/t/g.pdf"}},
      {"no > ends the template after the path", "<viewer.exe ^", std::nullopt, "/t/g.pdf", "", {""}},
      {"no > with a known name", "<viewer.exe", std::nullopt, "/t/g.pdf", "/bin/viewer.exe",
       {"/bin/viewer.exe"}},
      {"program acts inside a skipped section", "{<viewer.exe>}", std::nullopt, "/t/g.pdf",
       "/bin/viewer.exe", {"/bin/viewer.exe"}},
      // other characters, blanks and quotes
      {"literals at depth 0", "a-b", std::nullopt, "/t/g.pdf", "a-b", {"a-b"}},
      {"blanks separate", "a  b\tc", std::nullopt, "/t/g.pdf", "a  b\tc", {"a", "b", "c"}},
      {"quotes group", "\"a b\" c", std::nullopt, "/t/g.pdf", "\"a b\" c", {"a b", "c"}},
      {"empty quotes are an empty argument", "a \"\" b", std::nullopt, "/t/g.pdf", "a \"\" b", {"a", "", "b"}},
      {"quoted insertion", "\"^.pdf\"", std::nullopt, "/t/my g.pdf", "\"/t/my g.pdf\"", {"/t/my g.pdf"}},
      {"skipped blanks do not separate", "a{ }b", std::nullopt, "/t/g.pdf", "ab", {"ab"}},
      {"unclosed quote ends with the template", "\"a b", std::nullopt, "/t/g.pdf", "\"a b", {"a b"}},
      // the example of the documentation
      {"example with anchor", "<viewer.exe>{ -p #} ^.dvi", "5", "C:\\tex\\doc\\guide.dvi",
       "/bin/viewer.exe -p 5 C:\\tex\\doc\\guide.dvi", {"/bin/viewer.exe", "-p", "5", "C:\\tex\\doc\\guide.dvi"}},
      {"example without anchor", "<viewer.exe>{ -p #} ^.dvi", std::nullopt, "C:\\tex\\doc\\guide.dvi",
       "/bin/viewer.exe C:\\tex\\doc\\guide.dvi", {"/bin/viewer.exe", "C:\\tex\\doc\\guide.dvi"}},
      // inserted text never splits or groups
      {"quote and blanks in the name", "<viewer.exe> ^.dvi", std::nullopt, "/t/a\" --evil-opt=1 \"b.dvi",
       "/bin/viewer.exe /t/a\" --evil-opt=1 \"b.dvi", {"/bin/viewer.exe", "/t/a\" --evil-opt=1 \"b.dvi"}},
      {"anchor with quotes and blanks", "-p #", "a\" \"b c", "/t/g.pdf", "-p a\" \"b c", {"-p", "a\" \"b c"}},
      {"anchor next to literal text", "x#y", "1 2", "/t/g.pdf", "x1 2y", {"x1 2y"}},
  };
  for (const Row& row : rows) {
    TemplateCommand command = BuildTemplateCommand(row.tmpl, row.document,
                                                   row.anchor ? row.anchor->c_str() : nullptr,
                                                   FakeProgram, false);
    EXPECT_EQ(command.commandLine, row.commandLine) << row.what;
    EXPECT_EQ(command.argv, row.argv) << row.what;
  }
}

TEST(TemplateGrammar, ProgramNameIsCutTo31Characters) {
  std::vector<std::string> asked;
  auto lookup = [&](const std::string& name) {
    asked.push_back(name);
    return std::string();
  };
  BuildTemplateCommand("<" + std::string(40, 'p') + ">x", "/t/g.pdf", nullptr, lookup, false);
  ASSERT_EQ(asked.size(), 1u);
  EXPECT_EQ(asked[0], std::string(31, 'p'));
}

TEST(TemplateGrammar, TraceShowsEveryStep) {
  testing_support::MessageCapture capture;
  BuildTemplateCommand("a~b^", "/t/g.pdf", nullptr, FakeProgram, true);
  std::vector<std::string> lines;
  for (const auto& m : capture.messages()) lines.push_back(m.text);
  EXPECT_EQ(lines, (std::vector<std::string>{
                       "INFO: templ-sp: a~b^", "INFO: templ-dp: a",
                       "INFO: templ-sp: ~b^", "INFO: templ-dp: ab",
                       "INFO: templ-sp: ^", "INFO: templ-dp: ab/t/g",
                   }));

  capture.clear();
  BuildTemplateCommand("a~b^", "/t/g.pdf", nullptr, FakeProgram, false);
  EXPECT_TRUE(capture.messages().empty());
}

}  // namespace
