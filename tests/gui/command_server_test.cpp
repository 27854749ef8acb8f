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

#include <cstdint>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <memory>
#include <string>
#include <vector>

#include "command/server_gui.h"
#include "shell/log_gui.h"
#include "test_support.h"

namespace {

using testing_support::MessageCapture;
using testing_support::TempDir;

// The framework's wire bytes of one conversation that executes `command`.
std::string Conversation(const std::string& command) {
  std::string bytes;
  auto length = [&](std::uint32_t n) {
    for (int i = 0; i < 4; ++i) bytes.push_back(static_cast<char>(n >> (8 * i)));
  };
  bytes.push_back(10);  // connect
  length(11);
  bytes += "CommandLine";
  bytes.push_back(1);  // execute
  bytes.push_back(1);  // text
  length(static_cast<std::uint32_t>(command.size() + 1));
  bytes += command;
  bytes.push_back('\0');
  bytes.push_back(11);  // disconnect
  return bytes;
}

// Sends a conversation from a child process, so that the server in this
// process can answer while the child waits.  The child only makes system
// calls.
void SendFromChild(const std::string& socketPath, const std::string& command) {
  const std::string bytes = Conversation(command);
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strncpy(address.sun_path, socketPath.c_str(), sizeof address.sun_path - 1);
  const pid_t child = fork();
  if (child == 0) {
    const int fd = socket(AF_UNIX, SOCK_STREAM, 0);
    if (fd < 0 || connect(fd, reinterpret_cast<sockaddr*>(&address), sizeof address) != 0) _exit(1);
    // The connect answer first, then the rest.
    if (write(fd, bytes.data(), 16) != 16) _exit(2);
    char answer;
    if (read(fd, &answer, 1) != 1) _exit(3);
    const std::size_t rest = bytes.size() - 16;
    if (write(fd, bytes.data() + 16, rest) != static_cast<ssize_t>(rest)) _exit(4);
    char drain;
    while (read(fd, &drain, 1) > 0) {
    }
    _exit(0);
  }
}

void ReapChildren() {
  while (waitpid(-1, nullptr, WNOHANG) > 0) {
  }
}

class CommandServerTest : public ::testing::Test {
 protected:
  void SetUp() override {
    SetCommandRunner([this](const std::string& command) { ran_.push_back(command); });
  }
  void TearDown() override {
    SetCommandRunner({});
    ReapChildren();
  }
  bool Ran(const std::string& command) const {
    for (const auto& c : ran_)
      if (c == command) return true;
    return false;
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
  int step = 0;
  bool heldWhileModal = false;
  const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(20);
  wxTimer timer;
  timer.Bind(wxEVT_TIMER, [&](wxTimerEvent&) {
    if (std::chrono::steady_clock::now() > deadline) {
      if (dialog.IsModal()) dialog.EndModal(0);
      wxTheApp->ExitMainLoop();
      return;
    }
    switch (step) {
      case 0:
        SendFromChild(path, "first");
        step = 1;
        break;
      case 1:
        if (Ran("first")) {
          step = 2;
          wxTheApp->CallAfter([&] { dialog.ShowModal(); });
        }
        break;
      case 2:
        if (dialog.IsModal()) {
          SendFromChild(path, "second");
          step = 3;
        }
        break;
      case 3:
        if (capture.Contains("INFO: DDE server Execute second")) {
          heldWhileModal = !Ran("second") && DeferredCommandCount() == 1;
          dialog.EndModal(0);
          step = 4;
        }
        break;
      case 4:
        if (Ran("second")) wxTheApp->ExitMainLoop();
        break;
    }
  });
  timer.Start(10);
  wxTheApp->CallAfter([] {});  // the loop needs something to start on
  wxTheApp->MainLoop();
  timer.Stop();

  EXPECT_EQ(step, 4);
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
  {
    // What a killed instance leaves: a socket file nobody listens on.
    const int fd = socket(AF_UNIX, SOCK_STREAM, 0);
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::strncpy(address.sun_path, path.c_str(), sizeof address.sun_path - 1);
    ASSERT_EQ(bind(fd, reinterpret_cast<sockaddr*>(&address), sizeof address), 0);
    close(fd);
  }
  std::unique_ptr<MyServer> server(StartCommandServer(path));
  ASSERT_TRUE(server);

  // A later instance has put its own file there meanwhile: ours must not
  // remove it on the way out.
  ASSERT_EQ(unlink(path.c_str()), 0);
  std::ofstream(path) << "later instance";
  server.reset();
  EXPECT_TRUE(std::filesystem::exists(path));
}

TEST(LogTarget, FrameworkLevelsBecomeTagsAndLevels) {
  struct Row {
    wxLogLevel level;
    const char* prefix;
    int libraryLevel;
  };
  const Row rows[] = {
      {wxLOG_FatalError, "Docuvane-WX-ERROR: ", 5}, {wxLOG_Error, "Docuvane-WX-ERROR: ", 5},
      {wxLOG_Warning, "Docuvane-WX-WARNING: ", 4},  {wxLOG_Message, "Docuvane-WX-INFO: ", 3},
      {wxLOG_Status, "Docuvane-WX-INFO: ", 3},      {wxLOG_Info, "Docuvane-WX-INFO: ", 3},
      {wxLOG_Debug, "Docuvane-WX-INFO: ", 3},
  };
  MyLogGui log;
  for (const Row& row : rows) {
    MessageCapture capture;
    log.LogTextAtLevel(row.level, "some text");
    ASSERT_EQ(capture.messages().size(), 1u) << row.level;
    EXPECT_EQ(capture.messages()[0].prefix, row.prefix) << row.level;
    EXPECT_EQ(capture.messages()[0].text, "some text") << row.level;
    EXPECT_EQ(capture.messages()[0].level, row.libraryLevel) << row.level;
  }
}

TEST(LogTarget, TraitsMakeTheTargetAndReportAssertions) {
  MyAppTraits traits;
  std::unique_ptr<wxLog> target(traits.CreateLogTarget());
  EXPECT_NE(dynamic_cast<MyLogGui*>(target.get()), nullptr);

  MessageCapture capture;
  EXPECT_FALSE(traits.ShowAssertDialog("x > 0 failed"));
  EXPECT_FALSE(traits.ShowAssertDialog("again"));  // later assertions are still reported
  ASSERT_EQ(capture.messages().size(), 2u);
  EXPECT_EQ(capture.messages()[0].line(), "Docuvane-Assert: x > 0 failed");
  EXPECT_EQ(capture.messages()[0].level, 260);
}

}  // namespace
