// The command server inside a running event loop, and the framework's log
// target and traits.
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>
#include <wx/app.h>
#include <wx/dialog.h>
#include <wx/timer.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "command/server_gui.h"
#include "shell/log.h"
#include "test_support.h"

namespace {

using testing_support::MessageCapture;
using testing_support::TempDir;

sockaddr_un Address(const std::string& path) {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strncpy(address.sun_path, path.c_str(), sizeof address.sun_path - 1);
  return address;
}

// Sends the toolkit's wire bytes of a conversation that executes `command`
// from a child process (which only makes system calls), so that the server
// in this process can answer meanwhile.
void SendFromChild(const std::string& socketPath, const std::string& command) {
  const auto length = [](std::uint32_t n) { return std::string(reinterpret_cast<char*>(&n), 4); };
  const std::string open = '\x0a' + length(11) + "CommandLine";
  const std::string rest = "\x01\x01" + length(command.size() + 1) + command + '\0' + '\x0b';
  const sockaddr_un address = Address(socketPath);
  if (fork() != 0) return;
  const int fd = socket(AF_UNIX, SOCK_STREAM, 0);
  char answer;
  if (connect(fd, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0 ||
      write(fd, open.data(), open.size()) != ssize_t(open.size()) || read(fd, &answer, 1) != 1 ||
      write(fd, rest.data(), rest.size()) != ssize_t(rest.size()))
    _exit(1);
  while (read(fd, &answer, 1) > 0) {
  }
  _exit(0);
}

class CommandServerTest : public ::testing::Test {
 protected:
  void SetUp() override {
    SetCommandRunner([this](const std::string& command) { ran_.push_back(command); });
  }
  void TearDown() override {
    SetCommandRunner({});
    while (waitpid(-1, nullptr, WNOHANG) > 0) {
    }
  }
  bool Ran(const std::string& command) const {
    return std::find(ran_.begin(), ran_.end(), command) != ran_.end();
  }

  TempDir dir_;
  std::vector<std::string> ran_;
};

TEST_F(CommandServerTest, CommandDuringModalDialogWaitsUntilItCloses) {
  MessageCapture capture;
  const std::string path = dir_ / "sock";
  std::unique_ptr<MyServer> server(StartCommandServer(path));
  ASSERT_TRUE(server);

  wxDialog dialog(nullptr, wxID_ANY, "busy");
  bool heldWhileModal = false;
  // Each step runs on a timer tick until it returns true.
  const std::vector<std::function<bool()>> steps = {
      [&] { return SendFromChild(path, "first"), true; },
      [&] { return Ran("first") && (wxTheApp->CallAfter([&] { dialog.ShowModal(); }), true); },
      [&] { return dialog.IsModal() && (SendFromChild(path, "second"), true); },
      [&] {
        if (!capture.Contains("INFO: DDE server Execute second")) return false;
        heldWhileModal = !Ran("second") && DeferredCommandCount() == 1;
        dialog.EndModal(0);
        return true;
      },
      [&] { return Ran("second"); }};
  std::size_t step = 0;
  const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(20);
  wxTimer timer;
  timer.Bind(wxEVT_TIMER, [&](wxTimerEvent&) {
    if (step < steps.size() && steps[step]()) ++step;
    if (step < steps.size() && std::chrono::steady_clock::now() < deadline) return;
    if (dialog.IsModal()) dialog.EndModal(0);
    wxTheApp->ExitMainLoop();
  });
  timer.Start(10);
  wxTheApp->CallAfter([] {});  // the loop needs something to start on
  wxTheApp->MainLoop();
  timer.Stop();

  EXPECT_EQ(step, steps.size());
  EXPECT_TRUE(Ran("first"));
  EXPECT_TRUE(heldWhileModal) << "a command must not run inside a modal dialog";
  EXPECT_TRUE(Ran("second"));
  EXPECT_EQ(DeferredCommandCount(), 0u);
  EXPECT_TRUE(capture.Contains("INFO: DDE server busy, command deferred: second"));

  // Two conversations: only the one the server refers to goes at exit.
  capture.clear();
  server.reset();
  int disconnected = 0;
  for (const auto& m : capture.messages())
    if (m.line() == "INFO: DDE server Disconnected client") ++disconnected;
  EXPECT_EQ(disconnected, 1);
  EXPECT_FALSE(std::filesystem::exists(path)) << "the server removes its socket";
}

TEST_F(CommandServerTest, SocketPathRules) {
  struct Row {
    const char* what;
    std::string path;
    bool starts;
  };
  const std::string base = dir_.path() + "/";
  const Row rows[] = {
      {"a name without '/' would be a TCP port", "Lomari.DDE.Docuvane", false},
      {"107 bytes is the longest path", base + std::string(107 - base.size(), 's'), true},
      {"108 bytes would become an abstract socket", base + std::string(108 - base.size(), 't'),
       false},
      {"an empty path (runtime directory refused)", "", false},
  };
  for (const Row& row : rows) {
    MessageCapture capture;
    std::unique_ptr<MyServer> server(StartCommandServer(row.path));
    EXPECT_EQ(server != nullptr, row.starts) << row.what;
    EXPECT_EQ(capture.Contains("INFO: DDE server started Lomari.DDE.Docuvane"), row.starts)
        << row.what;
    EXPECT_EQ(capture.LevelOf("ERROR: DDE server failed to start Lomari.DDE.Docuvane"),
              row.starts ? -1 : 5)
        << row.what;
    if (row.starts) {
      struct stat st;
      ASSERT_EQ(stat(row.path.c_str(), &st), 0) << row.what;
      EXPECT_EQ(st.st_mode & 0777, 0600u) << row.what;
    }
  }
}

TEST_F(CommandServerTest, StaleSocketIsReplacedAndAnotherInstancesSocketIsKept) {
  const std::string path = dir_ / "sock";
  const int fd = socket(AF_UNIX, SOCK_STREAM, 0);  // a killed instance's leftover
  const sockaddr_un address = Address(path);
  ASSERT_EQ(bind(fd, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
  close(fd);
  std::unique_ptr<MyServer> server(StartCommandServer(path));
  ASSERT_TRUE(server);

  // A later instance has put its own file there meanwhile: ours must not
  // remove it on the way out.
  ASSERT_EQ(unlink(path.c_str()), 0);
  std::ofstream(path) << "later instance";
  server.reset();
  EXPECT_TRUE(std::filesystem::exists(path));
}

TEST(LogTarget, FrameworkLevelsBecomeTagsAndAssertionsAreReported) {
  struct Row {
    wxLogLevel level;
    const char* prefix;
    int libraryLevel;
  };
  const Row rows[] = {{wxLOG_FatalError, "Docuvane-WX-ERROR: ", 5},
                      {wxLOG_Warning, "Docuvane-WX-WARNING: ", 4},
                      {wxLOG_Message, "Docuvane-WX-INFO: ", 3},
                      {wxLOG_Debug, "Docuvane-WX-INFO: ", 3}};
  MyAppTraits traits;
  std::unique_ptr<wxLog> log(traits.CreateLogTarget());
  ASSERT_NE(dynamic_cast<MyLogGui*>(log.get()), nullptr);
  for (const Row& row : rows) {
    MessageCapture capture;
    log->LogTextAtLevel(row.level, "some text");
    ASSERT_EQ(capture.messages().size(), 1u) << row.level;
    EXPECT_EQ(capture.messages()[0].line(), row.prefix + std::string("some text")) << row.level;
    EXPECT_EQ(capture.messages()[0].level, row.libraryLevel) << row.level;
  }
  MessageCapture capture;
  EXPECT_FALSE(traits.ShowAssertDialog("x > 0 failed"));
  EXPECT_FALSE(traits.ShowAssertDialog("again"));  // later assertions are still reported
  ASSERT_EQ(capture.messages().size(), 2u);
  EXPECT_EQ(capture.messages()[0].line(), "Docuvane-Assert: x > 0 failed");
  EXPECT_EQ(capture.messages()[0].level, 260);
}

}  // namespace
