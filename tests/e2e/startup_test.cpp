// Start-up of the real program: its phases, and a second start by the same
// user that hands its command over and ends.
#include <gtest/gtest.h>

#include "e2e_support.h"

namespace {

using namespace e2e;

const std::vector<std::string> kPhases = {
    "Docuvane: Docuvane::OnInit --- Start",     "Docuvane: Docuvane::OnInit --- Names",
    "Docuvane: Docuvane::OnInit --- pConfig",   "Docuvane: Docuvane::OnInit --- Command_Line",
    "Docuvane: Docuvane::OnInit --- Frame ...", "Docuvane: Docuvane::OnInit --- Parse_Command_Line",
};

TEST(Startup, PhasesInOrderAndTheCommandLineLookedUp) {
  Sandbox box;
  Process first = box.StartInstance({"\\section"});
  ASSERT_TRUE(first.Running());
  const auto log = first.Log();
  EXPECT_TRUE(InOrder(log, kPhases)) << Describe(log);
  EXPECT_TRUE(InOrder(
      log,
      {"Docuvane: Docuvane::OnInit --- Command_Line", "INFO: Command_Line - \\section",
       "Docuvane: Docuvane::OnInit --- Frame ...", "INFO: DDE server started Lomari.DDE.Docuvane",
       "INFO: DDE server uses DDE", "Docuvane: Docuvane::OnInit --- Parse_Command_Line",
       "Docuvane: Search Keyword: \\section"}))
      << Describe(log);
  // Each phase once: nothing ran twice.
  for (const auto& phase : kPhases) EXPECT_EQ(CountLines(log, phase), 1) << phase;

  struct stat st;
  ASSERT_EQ(stat(box.socketPath().c_str(), &st), 0);
  EXPECT_TRUE(S_ISSOCK(st.st_mode));
  EXPECT_EQ(st.st_mode & 0777, 0600u);
  first.Stop();
}

TEST(Startup, SecondStartForwardsAndEndsWithoutWindow) {
  Sandbox box;
  Process first = box.StartInstance();
  ASSERT_TRUE(first.Running());

  Process second = box.Run({"{align}"});
  EXPECT_EQ(second.status, 255) << "a second start ends with the framework's failure status";
  const auto own = second.Log();
  EXPECT_EQ(CountLines(own, "Docuvane: Docuvane::OnInit --- Start"), 1) << Describe(own);
  // No settings read, no window built.
  EXPECT_FALSE(HasLineStarting(own, "Docuvane: Docuvane::OnInit --- Names")) << Describe(own);
  EXPECT_FALSE(HasLineStarting(own, "Docuvane: Docuvane::OnInit --- Frame")) << Describe(own);
  EXPECT_FALSE(HasLineStarting(own, "Docuvane: Docuvane_Init")) << Describe(own);
  EXPECT_TRUE(
      InOrder(own, {"Docuvane: Docuvane::OnInit --- Start", "INFO: Command_Line - {align}",
                    "INFO: SendCommand {align}", "INFO: DDE client is connecting...",
                    "INFO: Connection Client host=\"localhost\" port=\"Lomari.DDE.Docuvane\" "
                    "topic=\"CommandLine\" connected",
                    "INFO: DDE client Execute...", "INFO: DDE client disconnected from server"}))
      << Describe(own);

  ASSERT_TRUE(WaitFor([&] {
    return CountLines(first.Log(), "Docuvane: Search Keyword: {align}") == 1;
  })) << Describe(first.Log());
  EXPECT_TRUE(first.Running()) << "the first instance runs on";
  first.Stop();
}

TEST(Startup, SecondStartWithoutArgumentsSendsAnEmptyCommand) {
  Sandbox box;
  Process first = box.StartInstance();
  Process second = box.Run({});
  EXPECT_EQ(second.status, 255);
  EXPECT_EQ(CountLines(second.Log(), "INFO: SendCommand "), 1) << Describe(second.Log());
  ASSERT_TRUE(WaitFor([&] { return CountLines(first.Log(), "INFO: DDE server Execute ") == 1; }));
  EXPECT_TRUE(first.Running());
  first.Stop();
}

// The window id the instance registered, or 0.
unsigned long RegisteredWindow(const Sandbox& box) {
  std::ifstream in(box.runtimeDir() + "/window-Docuvane");
  unsigned long id = 0;
  in >> id;
  return id;
}

TEST(Startup, RegisteredWindowIsTheMainFrame) {
  Sandbox box;
  Process first = box.StartInstance();
  const unsigned long id = RegisteredWindow(box);
  ASSERT_NE(id, 0u);
  const std::string command = "xprop -id " + std::to_string(id) + " WM_NAME 2>&1";
  FILE* pipe = popen(command.c_str(), "r");
  ASSERT_NE(pipe, nullptr);
  char buffer[512] = {0};
  const std::size_t n = fread(buffer, 1, sizeof buffer - 1, pipe);
  pclose(pipe);
  EXPECT_NE(std::string(buffer, n).find("\"Lomari Docuvane\""), std::string::npos) << buffer;
  first.Stop();
}

TEST(Startup, SecondStartWithAStaleWindowRegistryStillForwards) {
  struct Row {
    const char* what;
    const char* content;  // NULL: no registration at all
  };
  const Row rows[] = {{"no window registered", nullptr},
                      {"a window that no longer exists", "4194303\n"},
                      {"garbage", "not a window\n"}};
  Sandbox box;
  Process first = box.StartInstance();
  int sent = 0;
  for (const Row& row : rows) {
    const std::string file = box.runtimeDir() + "/window-Docuvane";
    std::filesystem::remove(file);
    if (row.content) std::ofstream(file) << row.content;
    Process second = box.Run({"stale" + std::to_string(++sent)});
    EXPECT_EQ(second.status, 255) << row.what << Describe(second.Log());
    EXPECT_TRUE(WaitFor([&] {
      return CountLines(first.Log(), "INFO: DDE server Execute stale" + std::to_string(sent)) == 1;
    })) << row.what;
  }
  EXPECT_TRUE(first.Running());
  first.Stop();
}

TEST(Startup, ServerFailureLeavesTheProgramRunning) {
  // A runtime directory so deep that the socket path exceeds what the
  // kernel takes: the channel is refused, the window still comes up.
  Sandbox box(std::string(60, 'd') + "/" + std::string(60, 'e'));
  Process first = box.StartInstance();
  ASSERT_TRUE(first.Running());
  const auto log = first.Log();
  EXPECT_TRUE(HasLineStarting(log, "ERROR: DDE server socket path of ")) << Describe(log);
  EXPECT_EQ(CountLines(log, "ERROR: DDE server failed to start Lomari.DDE.Docuvane"), 1)
      << Describe(log);
  EXPECT_FALSE(std::filesystem::exists(box.socketPath()));
  // No abstract socket bound in its place either.
  std::ifstream unix("/proc/net/unix");
  std::string table((std::istreambuf_iterator<char>(unix)), std::istreambuf_iterator<char>());
  EXPECT_EQ(table.find(std::string(60, 'e') + "/lomari/Lomari.DDE"), std::string::npos);

  // A later start cannot reach it: three messages, then the end.
  Process second = box.Run({"x"});
  EXPECT_EQ(second.status, 255);
  const auto own = second.Log();
  EXPECT_TRUE(
      InOrder(own, {"INFO: SendCommand x", "INFO: DDE client is connecting...",
                    "INFO: Connection Client host=\"localhost\" port=\"Lomari.DDE.Docuvane\" "
                    "topic=\"CommandLine\" failed to connect"}))
      << Describe(own);
  EXPECT_TRUE(first.Running());
  first.Stop();
}

}  // namespace
