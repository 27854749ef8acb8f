// docuvane-open run as the program runs it, against stand-ins installed
// under the viewers' names on a PATH of their own, which record how they
// were started.
#include <gtest/gtest.h>
#include <spawn.h>
#include <sys/wait.h>

#include "test_support.h"

namespace {

using Args = std::vector<std::string>;
using testing_support::TempDir;

// Three pages, destinations in a name tree: "odd name\377" on page 3,
// "sec:two" on page 2 (poppler rebuilds the missing cross-reference table).
const char kPdf[] =
    "%PDF-1.4\n1 0 obj<</Type/Catalog/Pages 2 0 R/Names<</Dests<</Names[(odd name\\377)[5 0 R/Fit]"
    "(sec:two)[4 0 R/Fit]]>>>>>>endobj\n2 0 obj<</Type/Pages/Kids[3 0 R 4 0 R 5 0 R]/Count 3"
    "/MediaBox[0 0 9 9]>>endobj\n3 0 obj<</Type/Page/Parent 2 0 R>>endobj\n4 0 obj<</Type/Page"
    "/Parent 2 0 R>>endobj\n5 0 obj<</Type/Page/Parent 2 0 R>>endobj\ntrailer<</Root 1 0 R>>\n";

class Launcher : public ::testing::Test {
 protected:
  TempDir dir;
  const std::string doc = dir.Write("doc.pdf", kPdf), record = dir / "record";
  std::string path = dir / "bin";  // no xdg-mime here: no desktop default
  Args env;                        // DOCUVANE_VIEWER and the like

  // A stand-in that records its name and arguments, each ended by a NUL.
  void Install(const std::string& name) {
    const std::string script = "#!/bin/sh\nprintf '%s\\0' \"${0##*/}\" \"$@\" >'" + record + "'\n";
    std::filesystem::permissions(dir.Write("bin/" + name, script),
                                 std::filesystem::perms::owner_all);
  }

  // Runs the launcher in `dir`; what a viewer recorded, {} when none started.
  Args Open(const char* anchor, const std::string& document, int* status = nullptr) {
    std::filesystem::remove(record);
    Args argv{DOCUVANE_OPEN}, vars{"PATH=" + path};
    for (std::string var : {"HOME=home", "TEXMF=texmf", "XDG_CONFIG_HOME=config",
                            "XDG_CONFIG_DIRS=config", "XDG_DATA_HOME=data", "XDG_DATA_DIRS=data"})
      vars.push_back(var.insert(var.find('=') + 1, dir.path() + "/"));
    if (anchor) argv.push_back(anchor);
    argv.push_back(document);
    vars.insert(vars.end(), env.begin(), env.end());
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addchdir_np(&actions, dir.path().c_str());
    pid_t pid = -1;
    int raw = -1;
    if (posix_spawn(&pid, DOCUVANE_OPEN, &actions, nullptr, Pointers(argv).data(),
                    Pointers(vars).data()) == 0)
      waitpid(pid, &raw, 0);
    posix_spawn_file_actions_destroy(&actions);
    if (status) *status = WIFEXITED(raw) ? WEXITSTATUS(raw) : -1;
    std::ifstream in(record, std::ios::binary);
    Args words;
    for (std::string word; std::getline(in, word, '\0');) words.push_back(word);
    return words;
  }

  static std::vector<char*> Pointers(Args& strings) {
    std::vector<char*> pointers;
    for (auto& s : strings) pointers.push_back(s.data());
    pointers.push_back(nullptr);
    return pointers;
  }
};

TEST_F(Launcher, EachViewerIsToldThePlaceInItsOwnSyntax) {
  const std::string odd = "a b'\"$(x);`\n\t\\\377*?.pdf";  // relative to the launcher's directory
  std::filesystem::copy_file(doc, dir / odd);
  // "F" stands for the document (the row's, else doc.pdf); "F#x" for it with "#x" behind.
  const struct {
    const char *viewer, *anchor;
    Args expected;
    const char* document = nullptr;
  } rows[] = {
      {"evince", "page=12 15 ", {"-i", "12", "F"}},  // of several pages the first counts
      {"okular", "page=12 15 ", {"-p", "12", "F"}},
      {"zathura", "page=12 15 ", {"-P", "12", "F"}},
      {"mupdf", "page=12 15 ", {"F", "12"}},
      {"qpdfview", "page=12 15 ", {"F#12"}},
      {"atril", "page=3", {"-i", "3", "F"}},
      {"evince", "sec:two", {"-n", "sec:two", "F"}},  // viewers that take a destination
      {"okular", "nameddest=sec:two", {"F#sec:two"}},
      {"zathura", "sec:two", {"-P", "2", "F"}},  // the others get its page
      {"mupdf", "nameddest=sec:two", {"F", "2"}},
      {"qpdfview", "odd name\377", {"F#3"}},
      {"atril", "sec:two", {"-i", "2", "F"}},
      {"zathura", "no such destination", {"F"}},
      {"okular", nullptr, {"F"}},  // no anchor: no empty argument either
      {"atril", "page=0", {"F"}},
      {"xpdf", "page=5", {"F"}},  // a viewer of its own syntax gets no page
      {"evince", "\"; rm -rf ~ '\377", {"-n", "\"; rm -rf ~ '\377", "F"}, odd.c_str()},  // no shell
      {"zathura", "odd name\377", {"-P", "3", "F"}, odd.c_str()},
      {"evince", "page=2", {"-i", "2", "./-i.pdf"}, "-i.pdf"},  // not to be taken for an option
  };
  for (const auto& row : rows) {
    SCOPED_TRACE(std::string(row.viewer) + " " + (row.anchor ? row.anchor : "(none)"));
    Install(row.viewer);
    env = {std::string("DOCUVANE_VIEWER=") + row.viewer};
    Args expected{row.viewer};
    const std::string document = row.document ? row.document : doc;
    for (const std::string& word : row.expected)
      expected.push_back(word[0] == 'F' ? document + word.substr(1) : word);
    EXPECT_EQ(Open(row.anchor, document), expected);
  }
}

TEST_F(Launcher, ChoosesTheUsersViewerThenTheDesktopsThenAKnownOne) {
  for (const char* viewer : {"myviewer", "okular", "zathura", "evince"}) Install(viewer);
  dir.Write("texmf/Docuvane/Docuvane.ini", "[Setup]\nViewer=okular --unique\n");
  env = {"DOCUVANE_VIEWER=myviewer -x %f"};
  EXPECT_EQ(Open("page=5", doc), (Args{"myviewer", "-x", doc})) << "the environment first";
  env = {"DOCUVANE_VIEWER=not-installed"};
  EXPECT_EQ(Open("page=5", doc), (Args{"okular", "--unique", "-p", "5", doc}))
      << "then the INI key";

  // The desktop's default, through xdg-mime and its entry's Exec with field codes.
  path += ":/usr/bin:/bin";
  dir.Write("texmf/Docuvane/Docuvane.ini", "[Setup]\nViewer=\n");
  dir.Write("config/mimeapps.list", "[Default Applications]\napplication/pdf=desk.desktop\n");
  dir.Write(
      "data/applications/desk.desktop",
      "[Desktop Entry]\nType=Application\nName=Desk Viewer\nIcon=desk-icon\n"
      "Exec=env DESK=1 zathura --name=%c %i --fork %U %d\n[Desktop Action new]\nExec=evince\n");
  EXPECT_EQ(Open("page=5", doc), (Args{"zathura", "--name=Desk Viewer", "--icon", "desk-icon",
                                       "--fork", "-P", "5", doc}));

  std::filesystem::remove(dir / "config/mimeapps.list");
  EXPECT_EQ(Open("page=5", doc), (Args{"evince", "-i", "5", doc})) << "the first known one";

  path = dir / "nothing";
  int status = 0;
  EXPECT_EQ(Open("page=5", doc, &status), Args{});
  EXPECT_EQ(status, 1) << "no viewer at all";
}

}  // namespace
