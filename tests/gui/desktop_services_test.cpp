// The desktop services for real: programs started with exactly their
// arguments, and a download under a real progress dialog.
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <sstream>

#include "access/desktop_services_gui.h"
#include "gui_support.h"
#include "http_test_server.h"

namespace {

using gui_testing::Args;

std::string ReadFile(const std::string& path) {
  std::stringstream s;
  s << std::ifstream(path, std::ios::binary).rdbuf();
  return s.str();
}

TEST(DesktopServices, ExecuteHandsOverEveryArgumentUnchangedAndDownloads) {
  gui_testing::TempDir dir;
  const std::string record = dir / "record", touch = "touch " + dir / "SENTINEL";
  const std::string recorder =
      dir.Write("recorder", "#!/bin/sh\nfor a in \"$@\"; do printf '%s\\0' \"$a\"; done > '" +
                                record + ".tmp'\nmv '" + record + ".tmp' '" + record + "'\n");
  chmod(recorder.c_str(), 0755);
  const Args hostile = {"a\" --evil-opt=1 \"b",
                        "$(" + touch + ")",
                        "`" + touch + "`",
                        ";" + touch,
                        "|" + touch,
                        "back\\slash",
                        "-rf",
                        "new\nline",
                        "Gr\u00fc\u00dfe",
                        "",
                        "  blanks  "};
  DesktopAccessServices services(nullptr);
  Args argv{recorder};
  argv.insert(argv.end(), hostile.begin(), hostile.end());
  EXPECT_GT(services.Execute(argv), 0);
  ASSERT_TRUE(gui_testing::WaitFor([&] { return std::filesystem::exists(record); }));
  Args received;
  std::string content = ReadFile(record);
  for (std::size_t at = 0, end; (end = content.find('\0', at)) != std::string::npos; at = end + 1)
    received.push_back(content.substr(at, end - at));
  EXPECT_EQ(received, hostile);
  EXPECT_FALSE(std::filesystem::exists(dir / "SENTINEL"));
  EXPECT_EQ(services.Execute({}), 0);
  EXPECT_EQ(services.Execute({""}), 0) << "a template whose program was not found";
  EXPECT_EQ(services.Execute({dir / "missing-viewer"}), 0);

  testing_support::HttpTestServer server;
  server.Route("/doc.pdf", {200, std::string(300000, 'd')});
  EXPECT_EQ(services.Download("Downloading doc.pdf ...", server.Url("/doc.pdf"), dir / "doc.pdf"),
            300000);
  EXPECT_EQ(ReadFile(dir / "doc.pdf"), std::string(300000, 'd'));
}

}  // namespace
