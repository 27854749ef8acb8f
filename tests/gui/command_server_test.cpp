// The command server inside a running event loop.
#include <dlfcn.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>
#include <wx/app.h>
#include <wx/timer.h>

#include <chrono>
#include <functional>
#include <memory>

#include "access/desktop_services_gui.h"
#include "command/server_gui.h"
#include "command/wire.h"
#include "http_test_server.h"
#include "platform/modal_gui.h"
#include "platform/socket_posix.h"
#include "test_support.h"

namespace {

using testing_support::MessageCapture;
using testing_support::TempDir;

// A second process executing `command` in the toolkit's wire format; it exits
// 0 when the server has closed the conversation after its end, without a failure.
pid_t SendFromChild(const std::string& socketPath, const std::string& command) {
  const std::string all = "\x0a" + wire::Name("CommandLine") + "\x01\x01" +
                          wire::Data(command.c_str(), command.size() + 1) + "\x0b";
  const pid_t child = fork();
  if (child != 0) return child;
  bool refused;
  const int fd = ConnectTo(socketPath, &refused, nullptr);
  char answer[2];
  if (fd < 0 || !WriteAll(fd, all, 100) || WaitReadable(fd, 4000) != 1 ||
      ReadArrived(fd, answer, 1) != 1 || answer[0] != '\x0a')
    _exit(1);
  _exit(WaitReadable(fd, 4000) == 1 && ReadArrived(fd, answer, 1) == 0 ? 0 : 2);
}

// Closes the toolkit's modal windows (a message box) as their user would.
void AnswerModalWindows() {
  struct List {
    void* data;
    List* next;
  };
  const auto symbol = [](const char* name) { return dlsym(RTLD_DEFAULT, name); };
  const auto modal = reinterpret_cast<int (*)(void*)>(symbol("gtk_window_get_modal"));
  const auto respond = reinterpret_cast<void (*)(void*, int)>(symbol("gtk_dialog_response"));
  for (auto w = reinterpret_cast<List* (*)()>(symbol("gtk_window_list_toplevels"))(); w;
       w = w->next)
    if (modal(w->data)) respond(w->data, -4);  // closed from its title bar
}

// Runs `steps` from a timer in the main loop, each until it returns true.
bool RunSteps(const std::vector<std::function<bool()>>& steps) {
  std::size_t step = 0;
  const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(30);
  wxTimer timer;
  timer.Bind(wxEVT_TIMER, [&](wxTimerEvent&) {
    if (step < steps.size() && steps[step]()) ++step;
    if (step == steps.size() || std::chrono::steady_clock::now() > deadline)
      wxTheApp->ExitMainLoop();
  });
  timer.Start(10);
  wxTheApp->CallAfter([] {});  // the loop needs something to start on
  wxTheApp->MainLoop();
  return step == steps.size();
}

// A message box of the toolkit's own (modal, as a dialog) and a download
// that takes longer than a later start waits for an answer: the command that
// arrives meanwhile is answered at once, and runs only after them.
TEST(CommandServer, CommandsWaitForMessageBoxesAndDownloads) {
  TempDir dir;
  std::vector<std::string> ran;
  SetCommandRunner([&](const std::string& command) { ran.push_back(command); });
  testing_support::HttpTestServer docs;
  testing_support::HttpReply slow(200, std::string(60000, 'x'));
  slow.pieceSize = 1000;
  slow.pieceDelayMs = 110;  // about 6.5 s
  docs.Route("/slow.pdf", slow);
  MessageCapture capture;
  const std::string path = dir / "sock";
  std::unique_ptr<MyServer> server(StartCommandServer(path));
  ASSERT_TRUE(server);
  DesktopAccessServices services(nullptr);
  const struct {
    const char* what;
    std::function<void()> open, close;
    std::function<bool()> isOpen;
  } rows[] = {
      {"message box", [&] { services.ShowError("text", "Lomari Docuvane Error"); },
       AnswerModalWindows, ToolkitModalWindowShown},
      {"download", [&] { services.Download("slow", docs.Url("/slow.pdf"), dir / "slow.pdf"); },
       [] {}, [&] { return docs.Requests() > 0; }},
  };
  for (const auto& row : rows) {
    const std::string command = row.what;
    pid_t child = -1;
    int status = -1;
    bool held = false;
    const bool done = RunSteps({
        [&] { return wxTheApp->CallAfter(row.open), true; },
        [&] { return row.isOpen() && (child = SendFromChild(path, command)) > 0; },
        [&] {
          if (waitpid(child, &status, WNOHANG) != child) return false;
          held = ran.empty() && DeferredCommandCount() == 1;
          return row.close(), true;
        },
        [&] { return !ran.empty(); },
    });
    EXPECT_TRUE(done) << row.what;
    EXPECT_TRUE(held) << row.what << ": a command must not run inside it";
    EXPECT_EQ(status, 0) << row.what << ": the later start must get its answer meanwhile";
    EXPECT_TRUE(capture.Contains("INFO: DDE server busy, command deferred: " + command));
    ran.clear();
  }
  SetCommandRunner({});

  server.reset();
  EXPECT_FALSE(std::filesystem::exists(path)) << "the server removes its socket";
}

}  // namespace
