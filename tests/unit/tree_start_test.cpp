// Opening a tree item's document, the server's start page, and the
// desktop's file-type association.
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <chrono>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "access/opendoc.h"
#include "access/start_page.h"
#include "access/tree_activation.h"
#include "catalogue/documents.h"
#include "fake_access_services.h"
#include "platform/findexec.h"
#include "test_support.h"

namespace {

using testing_support::FakeAccessServices;
using testing_support::MessageCapture;
using testing_support::ScopedEnv;
using testing_support::TempDir;
using Args = std::vector<std::string>;

void* Item(long n) { return reinterpret_cast<void*>(n); }

TEST(TreeActivation, OpensTheFirstEntryOfTheItem) {
  const int savedCount = DocumentCount;
  const DocumentEntry saved[3] = {DocumentTable[0], DocumentTable[1], DocumentTable[2]};
  DocumentTable[0] = DocumentTable[1] = DocumentEntry{};
  DocumentTable[0].Name = "LaTeX>Guide";
  DocumentTable[0].FileName = "guide.pdf";
  DocumentTable[0].Path = "/d/guide.pdf";
  DocumentTable[0].Language = "en";
  DocumentTable[0].SearchMode = 2;
  DocumentTable[0].SameAs = -1;
  DocumentTable[0].TreeItem = Item(0x10);
  DocumentTable[1].Name = "Second";
  DocumentTable[1].SameAs = 0;
  DocumentTable[1].Path = "/d/second.pdf#page=4";
  DocumentTable[1].DefinitionFile = "/d/second.ddf";
  DocumentTable[1].TreeItem = Item(0x20);
  DocumentTable[2] = DocumentTable[1];
  DocumentTable[2].Path = "/d/shadowed.pdf";
  const char* kNotFound = "ERROR: Docuvane::Open_Document --- Not found clicked document";
  struct Row {
    const char* what;
    void* item;
    int count;
    Args traces;  // "INFOR: Openning " lines
    Args opened;  // what the default application receives
    const char* error;
  } rows[] = {
      // clang-format off
      {"entry with every field", Item(0x10), 3,
       {"INFOR: Openning UP Label='LaTeX>Guide', File='guide.pdf'",
        "INFOR: Openning KeyFile='NO', Language='en', fileName='/d/guide.pdf'"}, {"/d/guide.pdf"}, ""},
      {"empty fields read NO, lower index wins, anchor split", Item(0x20), 3,
       {"INFOR: Openning NR Label='Second', File='NO'",
        "INFOR: Openning KeyFile='/d/second.ddf', Language='NO', fileName='/d/second.pdf#page=4'"},
       {"/d/second.pdf"}, ""},
      // clang-format on
      {"null item", nullptr, 3, {}, {}, "ERROR: Docuvane::Open_Document invalid wxTreeItemId"},
      {"category item shows no document", Item(0x99), 3, {}, {}, kNotFound},
      {"empty table", Item(0x10), 0, {}, {}, kNotFound},
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(row.what);
    DocumentCount = row.count;
    FakeAccessServices services;
    MessageCapture capture;
    EXPECT_EQ(OpenTreeDocument(services, row.item), 0);
    Args traces;
    for (const auto& m : capture.messages())
      if (m.prefix == "INFOR: Openning " && m.level == 2) traces.push_back(m.line());
    EXPECT_EQ(traces, row.traces);
    EXPECT_EQ(services.defaultApplication, row.opened);
    EXPECT_EQ(capture.LevelOf("ERROR"), *row.error ? 5 : -1);
    EXPECT_TRUE(capture.Contains(row.error));
  }
  for (int i = 0; i < 3; ++i) DocumentTable[i] = saved[i];
  DocumentCount = savedCount;
}

TEST(StartPage, OpensAboutPageOrTellsTheUser) {
  const std::string p232(232, 'p');
  struct Row {
    const char* what;
    std::optional<std::string> server;
    bool browserWorks;
    std::string address;  // "" when the browser is not asked
    bool errorBox;
  } rows[] = {
      {"built-in default", std::nullopt, true,
       kDefaultDocumentServerURL + std::string("/about.php"), false},
      {"browser fails", std::string("http://docs.test"), false, "http://docs.test/about.php", true},
      {"address of exactly 259", "http://docs.test/" + p232, true,
       "http://docs.test/" + p232 + "/about.php", false},
      {"address beyond 259", "http://docs.test/p" + p232, true, "", true},
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(row.what);
    ScopedEnv env("DOCSERVER", row.server);
    DocumentServerURL = nullptr;
    FakeAccessServices services;
    services.browserResult = row.browserWorks;
    MessageCapture capture;
    EXPECT_EQ(OpenStartPage(services), !row.errorBox);
    EXPECT_EQ(services.browser, row.address.empty() ? Args{} : Args{row.address});
    const std::string address = std::string(DocumentServerURL) + "/about.php";
    const std::string box = "Can't open document server url '" + address +
                            "'\n\nIt is probably internet error. Try later.";
    using Boxes = std::vector<std::pair<std::string, std::string>>;
    EXPECT_EQ(services.errors, (row.errorBox ? Boxes{{box, "Lomari Docuvane Error"}} : Boxes{}));
    EXPECT_EQ(capture.Contains("ERROR: Can't open docuemnt server: " + address), row.errorBox);
  }
  DocumentServerURL = nullptr;
}

TEST(FindExecutable, FollowsTheAssociation) {
  TempDir dir;  // the desktop's MIME tool, programs and application entries
  chmod(dir.Write("bin/xdg-mime",
                  "#!/bin/sh\ncase \"$2\" in\n"
                  "  filetype) case \"$3\" in *.pdf) echo application/pdf;;"
                  " *.dvi) echo application/x-dvi;; *) exit 4;; esac;;\n"
                  "  default) case \"$3\" in application/pdf) echo acroreader.desktop;;"
                  " application/x-dvi) echo vendor-dviview.desktop;; esac;;\nesac\n")
            .c_str(),
        0755);
  for (const char* viewer : {"bin/acroread", "bin/dviview"})
    chmod(dir.Write(viewer, "#!/bin/sh\n").c_str(), 0755);
  dir.Write("data/applications/acroreader.desktop",
            "[Desktop Action New]\nExec=wrong\n[Desktop Entry]\nExec=env LANG=C acroread %U\n");
  dir.Write("data/applications/vendor/dviview.desktop",
            "[Desktop Entry]\nExec = \"dviview\" --page %f\n");
  ScopedEnv path("PATH", dir / "bin" + ":/usr/bin:/bin");
  ScopedEnv data("XDG_DATA_HOME", dir / "data");
  ScopedEnv dirs("XDG_DATA_DIRS", dir / "none");
  struct Row {
    const char* what;
    std::string file, program;
  } rows[] = {
      {"pdf through env and %U", dir.Write("a b.pdf", "x"), dir / "bin/acroread"},
      {"dvi in a vendor subdirectory, quoted program", dir.Write("-x.dvi", "x"),
       dir / "bin/dviview"},
      {"type unknown", dir.Write("c.txt", "x"), ""},
      {"file missing", dir / "missing.pdf", ""},
      {"empty name", "", ""},
  };
  for (const Row& row : rows) EXPECT_EQ(FindExecutable(row.file), row.program) << row.what;
}

TEST(FindExecutable, HelpersThatFailOrHangGiveNothing) {
  std::string out;
  const char* missing[] = {"docuvane-no-such-helper", nullptr};
  const char* failing[] = {"sh", "-c", "echo partial; exit 3", nullptr};
  const char* hanging[] = {"sh", "-c", "exec >&-; sleep 30", nullptr};
  const char* fine[] = {"sh", "-c", "printf 'a;b $(x)'", nullptr};
  EXPECT_FALSE(RunAndCapture(missing, out, 1000));
  EXPECT_FALSE(RunAndCapture(failing, out, 1000));
  auto start = std::chrono::steady_clock::now();
  EXPECT_FALSE(RunAndCapture(hanging, out, 300));
  EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(5));
  EXPECT_TRUE(RunAndCapture(fine, out, 1000));
  EXPECT_EQ(out, "a;b $(x)");
}

}  // namespace
