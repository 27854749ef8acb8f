// The server's start page, and the desktop's file-type association.
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <chrono>
#include <tuple>

#include "access/opendoc.h"
#include "access/start_page.h"
#include "fake_access_services.h"
#include "platform/findexec.h"
#include "test_support.h"

namespace {

using testing_support::FakeAccessServices;
using testing_support::MessageCapture;
using testing_support::ScopedEnv;
using Args = std::vector<std::string>;

TEST(StartPage, OpensAboutPageOrTellsTheUser) {
  const std::string p232(232, 'p');
  // server, the browser works, the address asked for ("" when not asked), an error box
  const std::tuple<std::optional<std::string>, bool, std::string, bool> rows[] = {
      {std::nullopt, true, kDefaultDocumentServerURL + std::string("/about.php"), false},
      {"http://docs.test", false, "http://docs.test/about.php", true},
      {"http://docs.test/" + p232, true, "http://docs.test/" + p232 + "/about.php", false},  // 259
      {"http://docs.test/p" + p232, true, "", true},
  };
  for (const auto& [server, browserWorks, address, errorBox] : rows) {
    ScopedEnv env("DOCSERVER", server);
    DocumentServerURL = nullptr;
    FakeAccessServices services;
    services.browserResult = browserWorks;
    MessageCapture capture;
    EXPECT_EQ(OpenStartPage(services), !errorBox) << address;
    EXPECT_EQ(services.browser, address.empty() ? Args{} : Args{address});
    const std::string url = std::string(DocumentServerURL) + "/about.php";
    using Boxes = std::vector<std::pair<std::string, std::string>>;
    const std::string box =
        "Can't open document server url '" + url + "'\n\nIt is probably internet error. Try later.";
    EXPECT_EQ(services.errors, (errorBox ? Boxes{{box, "Lomari Docuvane Error"}} : Boxes{}));
    EXPECT_EQ(capture.Contains("ERROR: Can't open docuemnt server: " + url), errorBox);
  }
  DocumentServerURL = nullptr;
}

TEST(FindExecutable, FollowsTheAssociationAndHelpersThatFailOrHangGiveNothing) {
  testing_support::TempDir dir;  // the desktop's MIME tool, programs and application entries
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
  ScopedEnv path("PATH", dir / "bin" + ":/usr/bin:/bin"), data("XDG_DATA_HOME", dir / "data"),
      dirs("XDG_DATA_DIRS", dir / "none");
  const std::pair<std::string, std::string> rows[] = {
      // file, program
      {dir.Write("a b.pdf", "x"), dir / "bin/acroread"},
      {dir.Write("-x.dvi", "x"), dir / "bin/dviview"},  // a vendor subdirectory, quoted
      {dir.Write("c.txt", "x"), ""},
      {dir / "missing.pdf", ""},
      {"", ""},
  };
  for (const auto& [file, program] : rows) EXPECT_EQ(FindExecutable(file), program) << file;

  std::string out;
  const char* missing[] = {"docuvane-no-such-helper", nullptr};
  const char* failing[] = {"sh", "-c", "echo partial; exit 3", nullptr};
  const char* hanging[] = {"sh", "-c", "exec >&-; sleep 30", nullptr};
  const char* fine[] = {"sh", "-c", "printf 'a;b $(x)'", nullptr};
  EXPECT_FALSE(RunAndCapture(missing, out, 1000));
  EXPECT_FALSE(RunAndCapture(failing, out, 1000));
  const auto start = std::chrono::steady_clock::now();
  EXPECT_FALSE(RunAndCapture(hanging, out, 300));
  EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(5));
  EXPECT_TRUE(RunAndCapture(fine, out, 1000));
  EXPECT_EQ(out, "a;b $(x)");
}

}  // namespace
