// Start-up of the real program, and later starts by the same user that hand
// their command over and end.
#include <gtest/gtest.h>

#include "e2e_support.h"

namespace {

using namespace e2e;

// Started by hand, the binary starts again under run-with-display.sh: never the desktop's display.
const bool kOnPrivateDisplay = [] {
  if (std::getenv("DOCUVANE_PRIVATE_DISPLAY")) return true;
  std::ifstream in("/proc/self/cmdline");
  std::vector<std::string> words = {"/bin/sh", __FILE__};
  words[1].replace(words[1].rfind("/e2e/"), std::string::npos, "/run-with-display.sh");
  for (std::string w; std::getline(in, w, '\0');) words.push_back(w);
  std::vector<char*> argv;
  for (auto& w : words) argv.push_back(w.data());
  argv.push_back(nullptr);
  execv("/bin/sh", argv.data());
  _exit(1);
}();

TEST(Startup, PhasesThenLaterStartsForwardAndEnd) {
  ASSERT_TRUE(kOnPrivateDisplay);
  Sandbox box;
  Process first = box.StartInstance({"\\section"});
  ASSERT_TRUE(first.Running());
  // clang-format off
  const std::vector<std::string> phases = {
      "Docuvane: Docuvane::OnInit --- Start", "Docuvane: Docuvane::OnInit --- Names",
      "Docuvane: Docuvane::OnInit --- pConfig", "Docuvane: Docuvane::OnInit --- Command_Line",
      "INFO: Command_Line - \\section", "Docuvane: Docuvane::OnInit --- Frame ...",
      "INFO: DDE server started Lomari.DDE.Docuvane", "INFO: DDE server uses DDE",
      "Docuvane: Docuvane::OnInit --- Parse_Command_Line", "Docuvane: Search Keyword: \\section"};
  // clang-format on
  Log log = first.Lines();
  EXPECT_TRUE(InOrder(log, phases)) << Describe(log);
  for (const auto& phase : phases) EXPECT_EQ(Count(log, phase), 1) << phase;
  struct stat st;
  ASSERT_EQ(stat(box.socketPath().c_str(), &st), 0);
  EXPECT_TRUE(S_ISSOCK(st.st_mode) && (st.st_mode & 0777) == 0600);
  // A second start reads no settings, builds no window, forwards and ends.
  Process second = box.Run({"{align}"});
  EXPECT_EQ(second.status, 255);
  const Log own = second.Lines();
  EXPECT_FALSE(HasPrefix(own, "Docuvane: Docuvane::OnInit --- Names") ||
               HasPrefix(own, "Docuvane: Docuvane::OnInit --- Frame"))
      << Describe(own);
  EXPECT_TRUE(
      InOrder(own, {"Docuvane: Docuvane::OnInit --- Start", "INFO: Command_Line - {align}",
                    "INFO: SendCommand {align}", "INFO: DDE client is connecting...",
                    "INFO: Connection Client host=\"localhost\" "
                    "port=\"Lomari.DDE.Docuvane\" topic=\"CommandLine\" connected",
                    "INFO: DDE client Execute...", "INFO: DDE client disconnected from server"}))
      << Describe(own);
  // No argument sends an empty command; a dead window registration does not stop the forwarding.
  for (const std::string word : {"", "dead"}) {
    if (!word.empty()) std::ofstream(box.runtimeDir() + "/window-Docuvane") << "4194303\n";
    Process later = box.Run(word.empty() ? std::vector<std::string>{} : std::vector{word});
    EXPECT_EQ(later.status, 255) << word << Describe(later.Lines());
    EXPECT_TRUE(WaitFor([&] { return Count(first.Lines(), "INFO: DDE server Execute " + word); }))
        << word;
  }
  EXPECT_TRUE(first.Running()) << "the first instance runs on";
  first.Stop();
}

}  // namespace
