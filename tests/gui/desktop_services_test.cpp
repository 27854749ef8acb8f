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

bool WaitForFile(const std::string& path, int ms = 5000) {
  auto end = std::chrono::steady_clock::now() + std::chrono::milliseconds(ms);
  struct stat st;
  while (stat(path.c_str(), &st) != 0 || st.st_size == 0) {
    if (std::chrono::steady_clock::now() > end) return false;
    wxYield();
    std::this_thread::sleep_for(std::chrono::milliseconds(10));
  }
  // The recorder writes its file in one go and then ends.
  for (int i = 0; i < 10; ++i) {
    wxYield();
    std::this_thread::sleep_for(std::chrono::milliseconds(10));
  }
  return true;
}

Args ReadRecord(const std::string& path) {
  std::ifstream in(path, std::ios::binary);
  std::stringstream s;
  s << in.rdbuf();
  Args args;
  std::string arg;
  for (char c : s.str()) {
    if (c == '\0') {
      args.push_back(arg);
      arg.clear();
    } else {
      arg += c;
    }
  }
  return args;
}

TEST(DesktopServices, ExecuteHandsOverEveryArgumentUnchanged) {
  TempDir dir;
  const std::string record = dir / "record";
  const std::string sentinel = dir / "SENTINEL";
  const std::string recorder = dir.Write(
      "recorder", "#!/bin/sh\nfor a in \"$@\"; do printf '%s\\0' \"$a\"; done > '" + record + ".tmp'\nmv '" +
                      record + ".tmp' '" + record + "'\n");
  chmod(recorder.c_str(), 0755);

  const Args hostile = {
      "a\" --evil-opt=1 \"b", "$(touch " + sentinel + ")", "`touch " + sentinel + "`", ";touch " + sentinel,
      "|touch " + sentinel,  "back\\slash",              "-rf",                       "new\nline",
      "Gr\xc3\xbc\xc3\x9f" "e", "",                        "  blanks  ",
  };
  DesktopAccessServices services(nullptr);
  Args argv{recorder};
  argv.insert(argv.end(), hostile.begin(), hostile.end());
  EXPECT_GT(services.Execute(argv), 0);
  ASSERT_TRUE(WaitForFile(record));
  EXPECT_EQ(ReadRecord(record), hostile);
  struct stat st;
  EXPECT_NE(stat(sentinel.c_str(), &st), 0);

  EXPECT_EQ(services.Execute({}), 0);
  EXPECT_EQ(services.Execute({""}), 0) << "a template whose program was not found";
  EXPECT_EQ(services.Execute({dir / "missing-viewer"}), 0);
}

TEST(DesktopServices, DownloadUnderTheProgressDialog) {
  testing_support::HttpTestServer server;
  testing_support::HttpReply reply;
  reply.body = std::string(300000, 'd');
  server.Route("/doc.pdf", reply);
  TempDir dir;
  DesktopAccessServices services(nullptr);
  EXPECT_EQ(services.Download("Downloading doc.pdf ...", server.Url("/doc.pdf"), dir / "doc.pdf"), 300000);
  std::ifstream in(dir / "doc.pdf", std::ios::binary);
  std::stringstream s;
  s << in.rdbuf();
  EXPECT_EQ(s.str(), reply.body);
}

TEST(DesktopServices, MessageBoxHookAnswersErrorBoxes) {
  struct Shown {
    std::string message, caption;
    long style;
  };
  std::vector<Shown> shown;
  DesktopAccessServices::TestMessageBoxHook() = [&](const std::string& m, const std::string& c, long style) {
    shown.push_back({m, c, style});
    return wxOK;
  };
  DesktopAccessServices services(nullptr);
  services.ShowError("Can't download", "Lomari Docuvane Error");
  DesktopAccessServices::TestMessageBoxHook() = {};
  ASSERT_EQ(shown.size(), 1u);
  EXPECT_EQ(shown[0].message, "Can't download");
  EXPECT_EQ(shown[0].caption, "Lomari Docuvane Error");
  EXPECT_EQ(shown[0].style, wxOK | wxICON_ERROR);
}

}  // namespace
