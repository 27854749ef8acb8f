// The desktop services for real: programs started with exactly their
// arguments, a download under a real progress dialog, the error box hook.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <wx/msgdlg.h>
#include <wx/utils.h>

#include <chrono>
#include <fstream>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include "access/desktop_services_gui.h"
#include "http_test_server.h"
#include "test_support.h"

namespace {

using testing_support::TempDir;
using Args = std::vector<std::string>;

std::string ReadFile(const std::string& path) {
  std::stringstream s;
  s << std::ifstream(path, std::ios::binary).rdbuf();
  return s.str();
}

TEST(DesktopServices, ExecuteHandsOverEveryArgumentUnchanged) {
  TempDir dir;
  const std::string record = dir / "record", touch = "touch " + dir / "SENTINEL";
  const std::string recorder =
      dir.Write("recorder", "#!/bin/sh\nfor a in \"$@\"; do printf '%s\\0' \"$a\"; done > '" +
                                record + ".tmp'\nmv '" + record + ".tmp' '" + record + "'\n");
  chmod(recorder.c_str(), 0755);
  // clang-format off
  const Args hostile = {"a\" --evil-opt=1 \"b", "$(" + touch + ")", "`" + touch + "`", ";" + touch,
                        "|" + touch, "back\\slash", "-rf", "new\nline", "Gr\u00fc\u00dfe", "",
                        "  blanks  "};
  // clang-format on
  DesktopAccessServices services(nullptr);
  Args argv{recorder};
  argv.insert(argv.end(), hostile.begin(), hostile.end());
  EXPECT_GT(services.Execute(argv), 0);
  struct stat st;
  for (int i = 0; i < 500 && stat(record.c_str(), &st) != 0; ++i) {
    wxYield();
    std::this_thread::sleep_for(std::chrono::milliseconds(10));
  }
  Args received;
  std::string content = ReadFile(record);
  for (std::size_t at = 0, end; (end = content.find('\0', at)) != std::string::npos; at = end + 1)
    received.push_back(content.substr(at, end - at));
  EXPECT_EQ(received, hostile);
  EXPECT_NE(stat((dir / "SENTINEL").c_str(), &st), 0);

  EXPECT_EQ(services.Execute({}), 0);
  EXPECT_EQ(services.Execute({""}), 0) << "a template whose program was not found";
  EXPECT_EQ(services.Execute({dir / "missing-viewer"}), 0);
}

TEST(DesktopServices, DownloadUnderTheProgressDialog) {
  testing_support::HttpTestServer server;
  server.Route("/doc.pdf", {200, std::string(300000, 'd')});
  TempDir dir;
  DesktopAccessServices services(nullptr);
  EXPECT_EQ(services.Download("Downloading doc.pdf ...", server.Url("/doc.pdf"), dir / "doc.pdf"),
            300000);
  EXPECT_EQ(ReadFile(dir / "doc.pdf"), std::string(300000, 'd'));
}

TEST(DesktopServices, MessageBoxHookAnswersErrorBoxes) {
  std::vector<std::string> shown;
  DesktopAccessServices::TestMessageBoxHook() = [&](const std::string& m, const std::string& c,
                                                    long style) {
    shown.insert(shown.end(), {m, c, std::to_string(style)});
    return wxOK;
  };
  DesktopAccessServices(nullptr).ShowError("Can't download", "Lomari Docuvane Error");
  DesktopAccessServices::TestMessageBoxHook() = {};
  EXPECT_EQ(shown,
            (Args{"Can't download", "Lomari Docuvane Error", std::to_string(wxOK | wxICON_ERROR)}));
}

}  // namespace
