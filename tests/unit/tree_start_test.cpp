// Opening a tree item's document, the server's start page, and the
// desktop's file-type association.
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <chrono>
#include <memory>
#include <optional>
#include <string>
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

void* Item(long n) { return reinterpret_cast<void*>(n); }

class TreeActivationTest : public ::testing::Test {
 protected:
  void SetUp() override {
    savedCount_ = DocumentCount;
    for (int i = 0; i < 3; ++i) saved_[i] = DocumentTable[i];
    DocumentTable[0] = DocumentEntry{};
    DocumentTable[0].Name = "LaTeX>Guide";
    DocumentTable[0].FileName = "guide.pdf";
    DocumentTable[0].Path = "/d/guide.pdf";
    DocumentTable[0].Language = "en";
    DocumentTable[0].SearchMode = 2;
    DocumentTable[0].SameAs = -1;
    DocumentTable[0].TreeItem = Item(0x10);
    DocumentTable[1] = DocumentEntry{};
    DocumentTable[1].Name = "Second";
    DocumentTable[1].SameAs = 0;
    DocumentTable[1].Path = "/d/second.pdf#page=4";
    DocumentTable[1].DefinitionFile = "/d/second.ddf";
    DocumentTable[1].TreeItem = Item(0x20);
    DocumentTable[2] = DocumentTable[1];
    DocumentTable[2].Path = "/d/shadowed.pdf";
    DocumentCount = 3;
  }
  void TearDown() override {
    for (int i = 0; i < 3; ++i) DocumentTable[i] = saved_[i];
    DocumentCount = savedCount_;
  }
  int savedCount_ = 0;
  DocumentEntry saved_[3];
};

TEST_F(TreeActivationTest, OpensTheFirstEntryOfTheItem) {
  struct Row {
    const char* what;
    void* item;
    int count;
    std::vector<std::string> traces;  // "INFOR: Openning " lines
    std::vector<std::string> opened;  // what the default application receives
    const char* error;
  } rows[] = {
      {"entry with every field", Item(0x10), 3,
       {"INFOR: Openning UP Label='LaTeX>Guide', File='guide.pdf'",
        "INFOR: Openning KeyFile='NO', Language='en', fileName='/d/guide.pdf'"},
       {"/d/guide.pdf"}, nullptr},
      {"empty fields read NO, lower index wins, anchor split by the opener", Item(0x20), 3,
       {"INFOR: Openning NR Label='Second', File='NO'",
        "INFOR: Openning KeyFile='/d/second.ddf', Language='NO', fileName='/d/second.pdf#page=4'"},
       {"/d/second.pdf"}, nullptr},
      {"null item", nullptr, 3, {}, {}, "ERROR: Docuvane::Open_Document invalid wxTreeItemId"},
      {"category item shows no document", Item(0x99), 3, {}, {},
       "ERROR: Docuvane::Open_Document --- Not found clicked document"},
      {"empty table", Item(0x10), 0, {}, {}, "ERROR: Docuvane::Open_Document --- Not found clicked document"},
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(row.what);
    DocumentCount = row.count;
    FakeAccessServices services;
    MessageCapture capture;
    EXPECT_EQ(OpenTreeDocument(services, row.item), 0);
    std::vector<std::string> traces;
    for (const auto& m : capture.messages()) {
      if (m.prefix == "INFOR: Openning ") {
        traces.push_back(m.line());
        EXPECT_EQ(m.level, 2);
      }
    }
    EXPECT_EQ(traces, row.traces);
    EXPECT_EQ(services.defaultApplication, row.opened);
    if (row.error) {
      EXPECT_TRUE(capture.Contains(row.error));
      EXPECT_EQ(capture.LevelOf(row.error), 5);
    }
  }
}

TEST(StartPage, OpensAboutPageOrTellsTheUser) {
  struct Row {
    const char* what;
    std::optional<std::string> server;
    bool browserWorks;
    std::string address;  // "" when the browser is not asked
    bool errorBox;
  } rows[] = {
      {"variable ending in a slash", std::string("http://docs.test/"), true, "http://docs.test//about.php", false},
      {"built-in default", std::nullopt, true, std::string(kDefaultDocumentServerURL) + "/about.php", false},
      {"browser fails", std::string("http://docs.test"), false, "http://docs.test/about.php", true},
      {"address beyond 259 characters", "http://docs.test/" + std::string(240, 'p'), true, "", true},
      {"address of exactly 259", "http://docs.test/" + std::string(232, 'p'), true,
       "http://docs.test/" + std::string(232, 'p') + "/about.php", false},
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(row.what);
    ScopedEnv env("DOCSERVER", row.server);
    DocumentServerURL = nullptr;
    FakeAccessServices services;
    services.browserResult = row.browserWorks;
    MessageCapture capture;
    bool opened = OpenStartPage(services);
    EXPECT_EQ(opened, !row.errorBox);
    if (row.address.empty()) {
      EXPECT_TRUE(services.browser.empty());
    } else {
      EXPECT_EQ(services.browser, std::vector<std::string>{row.address});
      EXPECT_TRUE(capture.Contains("Document Server URL: " + row.address));
    }
    if (row.errorBox) {
      std::string address = std::string(DocumentServerURL) + "/about.php";
      ASSERT_EQ(services.errors.size(), 1u);
      EXPECT_EQ(services.errors[0].first,
                "Can't open document server url '" + address + "'\n\nIt is probably internet error. Try later.");
      EXPECT_EQ(services.errors[0].second, "Lomari Docuvane Error");
      EXPECT_TRUE(capture.Contains("ERROR: Can't open docuemnt server: " + address));
    } else {
      EXPECT_TRUE(services.errors.empty());
    }
  }
  DocumentServerURL = nullptr;
}

// A desktop whose MIME tools and application entries live in a temporary
// directory.
class FindExecutableTest : public ::testing::Test {
 protected:
  void SetUp() override {
    WriteScript("bin/xdg-mime",
                "#!/bin/sh\n"
                "case \"$2\" in\n"
                "  filetype) case \"$3\" in *.pdf) echo application/pdf;; *.dvi) echo application/x-dvi;;"
                " *) exit 4;; esac;;\n"
                "  default) case \"$3\" in application/pdf) echo acroreader.desktop;;"
                " application/x-dvi) echo vendor-dviview.desktop;; esac;;\n"
                "esac\n");
    WriteScript("bin/acroread", "#!/bin/sh\n");
    WriteScript("bin/dviview", "#!/bin/sh\n");
    dir_.Write("data/applications/acroreader.desktop",
               "[Desktop Action New]\nExec=wrong\n[Desktop Entry]\nName=Reader\nExec=env LANG=C acroread %U\n");
    dir_.Write("data/applications/vendor/dviview.desktop", "[Desktop Entry]\nExec = \"dviview\" --page %f\n");
    path_ = std::make_unique<ScopedEnv>("PATH", dir_ / "bin" + ":/usr/bin:/bin");
    data_ = std::make_unique<ScopedEnv>("XDG_DATA_HOME", dir_ / "data");
    dirs_ = std::make_unique<ScopedEnv>("XDG_DATA_DIRS", dir_ / "none");
  }
  void WriteScript(const std::string& rel, const std::string& text) {
    chmod(dir_.Write(rel, text).c_str(), 0755);
  }
  TempDir dir_;
  std::unique_ptr<ScopedEnv> path_, data_, dirs_;
};

TEST_F(FindExecutableTest, FollowsTheAssociation) {
  struct Row {
    const char* what;
    std::string file;
    std::string program;
  } rows[] = {
      {"pdf through env and %U", dir_.Write("a b.pdf", "x"), dir_ / "bin/acroread"},
      {"dvi in a vendor subdirectory, quoted program", dir_.Write("-x.dvi", "x"), dir_ / "bin/dviview"},
      {"type unknown", dir_.Write("c.txt", "x"), ""},
      {"file missing", dir_ / "missing.pdf", ""},
      {"empty name", "", ""},
  };
  for (const Row& row : rows) EXPECT_EQ(FindExecutable(row.file), row.program) << row.what;
}

TEST_F(FindExecutableTest, HelpersThatFailOrHangGiveNothing) {
  std::string out;
  const char* missing[] = {"docuvane-no-such-helper", nullptr};
  EXPECT_FALSE(RunAndCapture(missing, out, 1000));
  const char* failing[] = {"sh", "-c", "echo partial; exit 3", nullptr};
  EXPECT_FALSE(RunAndCapture(failing, out, 1000));
  const char* hanging[] = {"sh", "-c", "exec >&-; sleep 30", nullptr};
  auto start = std::chrono::steady_clock::now();
  EXPECT_FALSE(RunAndCapture(hanging, out, 300));
  EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(5));
  const char* fine[] = {"sh", "-c", "printf 'a;b $(x)'", nullptr};
  EXPECT_TRUE(RunAndCapture(fine, out, 1000));
  EXPECT_EQ(out, "a;b $(x)");
}

}  // namespace
