// The command channel between a running instance and later starts.
#include <grp.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <memory>
#include <tuple>

#include "e2e_support.h"
#include "platform/instance_lock.h"

namespace {

using namespace e2e;
using Raw = RawChannel;

std::map<std::string, int> Executed(const Process& p) {
  std::map<std::string, int> seen;
  for (const auto& l : p.Lines())
    if (l.text.compare(0, 25, "INFO: DDE server Execute ") == 0) ++seen[l.text.substr(25)];
  return seen;
}

void ExpectEachOnce(const Process& p, const std::vector<std::string>& words) {
  std::map<std::string, int> seen;
  WaitFor([&] {
    seen = Executed(p);
    return std::all_of(words.begin(), words.end(), [&](const auto& w) { return seen.count(w); });
  });
  for (const auto& w : words) EXPECT_EQ(seen[w], 1) << w << Describe(p.Lines());
}

void ExpectAnswering(const Sandbox& box) {  // the instance's event loop is not held
  const auto start = Clock::now();
  Raw probe;
  std::string reply;
  EXPECT_TRUE(probe.Connect(box.socketPath()) && probe.Open("CommandLine") == Raw::kConnect &&
              probe.Request("bytes[3]", &reply) == Raw::kRequestReply && reply == "123");
  EXPECT_LT(Clock::now() - start, milliseconds(500)) << "the window is held";
}

TEST(CommandChannel, OneInstanceUnderHostileSilentAndManyClients) {
  Sandbox box;
  Process first = box.StartInstance();
  // Silent clients are dropped on their own time-out; nobody waits for them.
  std::vector<Raw> silent(20);
  for (Raw& c : silent) ASSERT_TRUE(c.Connect(box.socketPath()));
  std::vector<std::string> words;
  std::vector<Process> later;
  for (int i = 0; i < 50; ++i)
    later.push_back(box.Start({words.emplace_back("once" + std::to_string(i))}));
  ExpectAnswering(box);
  for (auto& p : later) EXPECT_EQ(p.Wait(milliseconds(60000)), 255) << Describe(p.Lines());
  ExpectEachOnce(first, words);
  for (Raw& c : silent) EXPECT_TRUE(c.ReadByte() == Raw::kFail && c.ReadByte() == -1);
  const std::string timeOut = "no complete message within 2000 ms";
  EXPECT_EQ(Count(first.Lines(), "ERROR: DDE server connection closed: " + timeOut, 5), 20);

  // Messages that claim too much, stop short or never end: each drops only its own connection.
  const long peakBefore = first.PeakKiB();
  const auto execute = [](std::uint32_t claim) { return "\1\1" + Raw::Length(claim) + "cutcmd!"; };
  const std::pair<std::string, std::string> bad[] = {
      {execute(64u << 20), "data claims 67108864 bytes, at most 4096"},
      {execute(512u << 20), "data claims 536870912 bytes, at most 4096"},
      {execute(0xFFFFFFFFu), "data claims 4294967295 bytes, at most 4096"},
      {'\2' + Raw::Length(1u << 30), "a name claims 1073741824 bytes, at most 256"},
      {'\12' + Raw::Length(1u << 20) + "Comm", "a name claims 1048576 bytes, at most 256"},
      {execute(100), "the client went away after 13 bytes of a message"},
      {execute(100), timeOut},
      {"\x2a", "unknown message code 42"}};
  for (const auto& [bytes, error] : bad) {
    Raw c;
    ASSERT_TRUE(c.Connect(box.socketPath()));
    const bool opens = bytes[0] != Raw::kConnect && bytes[0] != 0x2a;
    ASSERT_TRUE(!opens || c.Open("CommandLine") == Raw::kConnect);
    c.Send(bytes[0], bytes.substr(1));
    if (error.compare(0, 8, "the clie") == 0)
      c.Close();
    else
      EXPECT_TRUE(c.ReadByte() == Raw::kFail && c.ReadByte() == -1) << error;
    EXPECT_TRUE(WaitFor(
        [&] { return HasPrefix(first.Lines(), "ERROR: DDE server connection closed: " + error); }));
    ExpectAnswering(box);
  }
  EXPECT_EQ(box.Run({"after-attack"}).status, 255);
  ExpectEachOnce(first, {"after-attack"});
  EXPECT_EQ(Executed(first).count("cutcmd!"), 0u) << "nothing of a dropped message runs";
  EXPECT_LT(first.PeakKiB() - peakBefore, 32 * 1024) << "memory stays flat";

  // Topics and request items: every reply states its size and format.
  for (const std::string topic : {"Other", "commandline", "CommandLine ", ""}) {
    Raw refused;
    EXPECT_TRUE(refused.Connect(box.socketPath()) && refused.Open(topic) == Raw::kFail);
  }
  Raw channel;
  ASSERT_TRUE(channel.Connect(box.socketPath()) && channel.Open("CommandLine") == Raw::kConnect);
  // Item, format (1 text, 2 bitmap, 13 UTF-16, 17 UTF-8, 18 UTF-32), answered.
  const std::tuple<std::string, char, bool> requests[] = {
      {"Date", 1, true},    {"Date", 17, true},    {"Date", 2, true},       {"Date", 18, false},
      {"Date", 13, false},  {"Date+len", 1, true}, {"Date+len", 18, false}, {"bytes[3]", 18, true},
      {"Date+x", 1, false}, {"date", 1, false},    {"nothing", 1, false}};
  for (const auto& [item, format, answered] : requests) {
    std::string reply;
    EXPECT_EQ(channel.Request(item, &reply, format), answered ? Raw::kRequestReply : Raw::kFail)
        << item << +format;
    // Narrow text and its NUL, not a byte more; "Date+len" has the time first.
    const bool date = answered && item != "bytes[3]";
    EXPECT_TRUE(!date || (reply.size() > 8 && reply.find('\0') + 1 == reply.size()));
    EXPECT_TRUE(item != "Date+len" || !answered || reply.find(':') < reply.find(' ')) << reply;
    EXPECT_TRUE(item != "bytes[3]" || reply == "123");
  }
  channel.Send(Raw::kAdviseStart, Raw::Text("Loop"));
  EXPECT_EQ(channel.ReadByte(), Raw::kAdviseStart);
  channel.Send(Raw::kDisconnect, "");
  const Log log = first.Lines();
  EXPECT_EQ(Count(log, "ERROR: DDE server Unknown topic, connection refused", 5), 4);
  EXPECT_EQ(Count(log, "ERROR: DDE server Unknown requestOnExecute Date+x", 2), 1);
  first.Stop();
}

// An instance (the lock held here) whose channel takes connections but
// never answers; one whose runtime directory is refused; a later start that
// names another runtime directory.  None of them gives a second window.
TEST(CommandChannel, LaterStartsSayWhenTheirCommandIsNotDelivered) {
  const std::string lost = "ERROR: MyApp::OnInit command not delivered to the running instance: x";
  const std::vector<std::string> toStderr = {"TROVLIB_STDERR_LEVEL=4"};
  Sandbox box;
  std::filesystem::create_directories(box.runtimeDir());
  chmod(box.runtimeDir().c_str(), 0700);
  auto lock = std::make_unique<InstanceLock>();
  ASSERT_TRUE(lock->Create(box.lockName(), box.home()));
  const int listener = ListenAt(box.socketPath(), nullptr);  // and never accepts
  ASSERT_GE(listener, 0);
  const auto start = Clock::now();
  Process stuck = box.Run({"x"}, toStderr);
  EXPECT_EQ(stuck.status, 1);
  EXPECT_LT(Clock::now() - start, milliseconds(15000));
  EXPECT_TRUE(Count(stuck.Lines(), lost, 5) == 1 && stuck.Output().find(lost) != std::string::npos);
  CloseSocket(listener);
  lock.reset();

  // The stand-in's socket is left behind, as by a killed instance.
  Process first = box.StartInstance();
  EXPECT_EQ(box.Run({"served"}).status, 255);
  ExpectEachOnce(first, {"served"});
  EXPECT_EQ(box.Run({"x"}, {"XDG_RUNTIME_DIR=" + box.root()}).status, 1) << "the same lock";
  first.Stop();
  chmod(box.runtimeDir().c_str(), 0755);
  first = box.StartInstance();
  Process off = box.Run({"x"}, toStderr);
  EXPECT_EQ(off.status, 2);
  EXPECT_NE(off.Output().find("ERROR: MyApp::OnInit command channel off, command not delivered: x"),
            std::string::npos);
  first.Stop();
}

}  // namespace

namespace {

// Another user who reaches the socket (every directory opened up) is
// refused before anything is read; the owner is still served.
TEST(CommandChannel, OtherUsersAreRefused) {
  if (geteuid() != 0) GTEST_SKIP() << "needs root to become another user";
  Sandbox box;
  Process first = box.StartInstance();
  for (auto dir = std::filesystem::path(box.socketPath()).parent_path();
       dir.string().size() >= box.root().size(); dir = dir.parent_path())
    chmod(dir.c_str(), 0755);
  chmod(box.socketPath().c_str(), 0666);
  const pid_t child = fork();
  if (child == 0) {  // as nobody: open the conversation and send a command
    if (setgroups(0, nullptr) != 0 || setgid(65534) != 0 || setuid(65534) != 0) _exit(200);
    Raw channel;
    if (!channel.Connect(box.socketPath())) _exit(201);
    const bool accepted = channel.Open("CommandLine") == Raw::kConnect;
    _exit(accepted ? 100 : 0);
  }
  int status = 0;
  waitpid(child, &status, 0);
  EXPECT_EQ(WIFEXITED(status) ? WEXITSTATUS(status) : -1, 0) << "the conversation was accepted";
  EXPECT_TRUE(WaitFor([&] {
    return HasPrefix(first.Lines(), "ERROR: DDE server connection of another user (uid 65534)");
  })) << Describe(first.Lines());
  chmod(box.runtimeDir().c_str(), 0700);
  EXPECT_EQ(box.Run({"owner"}).status, 255);
  ExpectEachOnce(first, {"owner"});
  first.Stop();
}

}  // namespace
