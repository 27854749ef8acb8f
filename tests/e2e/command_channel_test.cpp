// The command channel between a running instance and later starts.
#include <grp.h>
#include <gtest/gtest.h>

#include <map>

#include "e2e_support.h"
#include "platform/instance_lock.h"

namespace {

using namespace e2e;

std::string Word(const char* tag, int i) { return tag + std::to_string(1000 + i); }

// How often each command reached the instance's command processing.
std::map<std::string, int> Executed(const Process& p) {
  std::map<std::string, int> seen;
  const std::string prefix = "INFO: DDE server Execute ";
  for (const auto& l : p.Lines())
    if (l.text.compare(0, prefix.size(), prefix) == 0) ++seen[l.text.substr(prefix.size())];
  return seen;
}

// Every word of `words` executed exactly once.
void ExpectEachOnce(const Process& p, const std::vector<std::string>& words) {
  std::map<std::string, int> seen;
  ASSERT_TRUE(WaitFor([&] {
    seen = Executed(p);
    for (const auto& w : words)
      if (!seen.count(w)) return false;
    return true;
  })) << Describe(p.Lines());
  for (const auto& w : words) EXPECT_EQ(seen[w], 1) << w;
}

TEST(CommandChannel, HostileSilentAndManyLaterStartsEachProcessedOnce) {
  Sandbox box;
  Process first = box.StartInstance();
  const std::string marker = box.root() + "/shell-ran";
  const std::string shell = "$(touch " + marker + ");`touch " + marker + "`";
  struct Row {
    const char* what;
    std::string arg, arrives;
  };
  const std::vector<Row> rows = {
      {"only a question mark", "?", "?"},
      {"quotes and blanks", "say \"hi\" there", "\"say \"hi\" there\""},
      {"shell characters", shell, "\"" + shell + "\""},
      {"10,000 characters arrive cut to 1023", std::string(10000, 'z'), std::string(1023, 'z')},
      {"invalid UTF-8, then the next command still served", "\xff\xfe\x80 bad", ""},
  };
  for (const Row& row : rows) {
    EXPECT_EQ(box.Run({row.arg}).status, 255) << row.what;
    if (row.arrives.empty()) {
      EXPECT_EQ(box.Run({"after-odd"}).status, 255);
    }
    ExpectEachOnce(first, {row.arrives.empty() ? "after-odd" : row.arrives});
    ASSERT_TRUE(first.Running()) << row.what;
  }
  EXPECT_FALSE(std::filesystem::exists(marker)) << "a command must never reach a shell";

  // A client that connects and says nothing holds the window only briefly.
  RawChannel silent;
  ASSERT_EQ(silent.Connect(box.socketPath()), 0);
  const auto sent = Clock::now();
  EXPECT_EQ(box.Run({"after-silence"}).status, 255);
  ExpectEachOnce(first, {"after-silence"});
  EXPECT_LT(Clock::now() - sent, milliseconds(6000));
  EXPECT_TRUE(HasPrefix(first.Lines(), "WARNING: DDE server client sent no request"));
  EXPECT_EQ(silent.ReadByte(), -1) << "the server closed the silent connection";

  std::vector<std::string> words;
  for (int i = 0; i < 100; ++i) {
    words.push_back(Word("row", i));
    ASSERT_EQ(box.Run({words.back()}).status, 255) << words.back();
  }
  ExpectEachOnce(first, words);

  words.clear();
  std::vector<Process> later;
  for (int i = 0; i < 50; ++i) {
    words.push_back(Word("once", i));
    later.push_back(box.Start({words.back()}));
  }
  for (auto& p : later) EXPECT_EQ(p.Wait(milliseconds(60000)), 255) << Describe(p.Lines());
  ExpectEachOnce(first, words);
  EXPECT_TRUE(first.Running());
  first.Stop();
}

TEST(CommandChannel, TenColdStartsGiveOneInstanceAndNineForwardedCommands) {
  Sandbox box;
  std::vector<Process> starts;
  for (int i = 0; i < 10; ++i) starts.push_back(box.Start({Word("cold", i)}));
  const auto running = [&] {
    int n = 0;
    for (auto& p : starts) n += p.Running();
    return n;
  };
  ASSERT_TRUE(WaitFor([&] { return running() <= 1; }, milliseconds(60000)));
  ASSERT_EQ(running(), 1);
  std::vector<std::string> forwarded;
  Process* instance = nullptr;
  for (int i = 0; i < 10; ++i) {
    if (starts[i].Running()) {
      instance = &starts[i];
      continue;
    }
    EXPECT_EQ(starts[i].status, 255) << Describe(starts[i].Lines());
    forwarded.push_back(Word("cold", i));
  }
  ExpectEachOnce(*instance, forwarded);
  EXPECT_EQ(Executed(*instance).size(), 9u);
  instance->Stop();
}

TEST(CommandChannel, RequestItemsAdvisePokeAndForeignTopics) {
  Sandbox box;
  Process first = box.StartInstance();
  for (const std::string topic : {"Other", "commandline", "CommandLine ", ""}) {
    RawChannel refused;
    ASSERT_EQ(refused.Connect(box.socketPath()), 0);
    EXPECT_EQ(refused.Open(topic), RawChannel::kFail) << topic;
  }
  RawChannel channel;
  ASSERT_EQ(channel.Connect(box.socketPath()), 0);
  ASSERT_EQ(channel.Open("CommandLine"), RawChannel::kConnect);
  const int reply = RawChannel::kRequestReply, fail = RawChannel::kFail;
  std::map<std::string, std::string> replies;
  for (const auto& [item, code] : std::vector<std::pair<std::string, int>>{{"Date", reply},
                                                                           {"Date+len", reply},
                                                                           {"bytes[3]", reply},
                                                                           {"Date+x", fail},
                                                                           {"date", fail},
                                                                           {"nothing", fail}})
    EXPECT_EQ(channel.Request(item, &replies[item]), code) << item;
  // Both dates: text with its NUL counted; "Date+len" has the time first.
  for (const std::string& date : {replies["Date"], replies["Date+len"]}) {
    ASSERT_GT(date.size(), 1u);
    EXPECT_EQ(std::strlen(date.c_str()) + 1, date.size()) << date;
  }
  const std::string& withLength = replies["Date+len"];
  EXPECT_LT(withLength.find(':'), withLength.find(' ')) << withLength;
  EXPECT_EQ(replies["bytes[3]"], "123");
  channel.Send(RawChannel::kAdviseStart, RawChannel::Text("Loop"));
  EXPECT_EQ(channel.ReadByte(), RawChannel::kAdviseStart);
  channel.Send(RawChannel::kAdviseStop, RawChannel::Text("Loop"));
  EXPECT_EQ(channel.ReadByte(), RawChannel::kAdviseStop);
  channel.Send(RawChannel::kPoke,
               RawChannel::Text("Item") + '\1' + RawChannel::Text(std::string("x", 2)));
  channel.Send(RawChannel::kDisconnect, "");

  ASSERT_TRUE(WaitFor([&] { return HasPrefix(first.Lines(), "INFO: DDE server OnDisconnect()"); }));
  const Log log = first.Lines();
  EXPECT_EQ(Count(log, "ERROR: DDE server Unknown topic, connection refused", 5), 4)
      << Describe(log);
  EXPECT_EQ(Count(log, "INFO: DDE server Connection accepted"), 1);
  EXPECT_EQ(Count(log, "INFO: DDE server OnRequest..."), 3) << Describe(log);
  for (const char* item : {"Date+x", "date", "nothing"})
    EXPECT_EQ(Count(log, std::string("ERROR: DDE server Unknown requestOnExecute ") + item, 2), 1);
  EXPECT_TRUE(
      InOrder(log, {"INFO: DDE server OnStartAdvise Loop", "INFO: DDE server OnStopAdvise Loop",
                    "INFO: DDE server OnPoke...", "INFO: DDE server OnDisconnect()"}))
      << Describe(log);
  EXPECT_TRUE(first.Running());
  first.Stop();
}

TEST(CommandChannel, RecoveryAfterTheInstanceIsKilled) {
  const std::vector<std::pair<const char*, const char*>> rows = {
      {"stale socket, lock file as left", nullptr},
      {"empty lock file", ""},
      {"lock file naming a live process of this user", "self"}};
  for (const auto& [what, lockContent] : rows) {
    Sandbox box;
    Process killed = box.StartInstance();
    ASSERT_TRUE(killed.Running()) << what;
    killed.Kill(SIGKILL);
    ASSERT_TRUE(std::filesystem::exists(box.socketPath())) << "a killed instance leaves its socket";
    if (lockContent)
      std::ofstream(box.lockPath(), std::ios::trunc)
          << (*lockContent ? std::to_string(getpid()) + "\n" : "");
    Process next = box.StartInstance({"again"});
    ASSERT_TRUE(next.Running()) << what;
    EXPECT_EQ(Count(next.Lines(), "INFO: DDE server started Lomari.DDE.Docuvane"), 1) << what;
    EXPECT_EQ(box.Run({"served"}).status, 255) << what;
    ExpectEachOnce(next, {"served"});
    next.Stop();
  }
}

TEST(CommandChannel, LaterStartNeverHangsOnAStuckInstance) {
  for (const bool listening : {true, false}) {
    // Stand in for a running instance: hold its lock, and a socket that
    // takes connections but never answers (or none).
    Sandbox box;
    std::filesystem::create_directories(box.runtimeDir());
    chmod(box.runtimeDir().c_str(), 0700);
    InstanceLock lock;
    ASSERT_TRUE(lock.Create(box.lockName(), box.runtimeDir()));
    const int listener = socket(AF_UNIX, SOCK_STREAM, 0);
    const sockaddr_un address = UnixAddress(box.socketPath());
    if (listening) {
      ASSERT_EQ(bind(listener, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
      ASSERT_EQ(listen(listener, 5), 0);
    }
    const auto start = Clock::now();
    Process later = box.Run({"lost"}, milliseconds(30000));
    EXPECT_EQ(later.status, 255) << listening;
    EXPECT_LT(Clock::now() - start, milliseconds(15000)) << listening;
    const Log own = later.Lines();
    ASSERT_FALSE(own.empty());
    EXPECT_NE(own.back().text.find("failed to connect"), std::string::npos) << Describe(own);
    EXPECT_EQ(Count(own, "ERROR: DDE client no answer from the server"), listening ? 1 : 0)
        << Describe(own);
    close(listener);
  }
}

// Connects as the user `nobody` and tries to run a command: the error of
// connect(), 100 when the conversation was accepted, else 0.
int ConnectAsNobody(const std::string& socketPath) {
  const pid_t child = fork();
  if (child == 0) {
    if (setgroups(0, nullptr) != 0 || setgid(65534) != 0 || setuid(65534) != 0) _exit(200);
    RawChannel channel;
    if (const int error = channel.Connect(socketPath)) _exit(error);
    const bool accepted = channel.Open("CommandLine") == RawChannel::kConnect;
    channel.Send(RawChannel::kExecute, '\1' + RawChannel::Text(std::string("intruder", 9)));
    _exit(accepted ? 100 : 0);
  }
  int status = 0;
  waitpid(child, &status, 0);
  return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

TEST(CommandChannel, OtherUsersAreRefused) {
  if (geteuid() != 0) GTEST_SKIP() << "needs root to switch to another user";
  Sandbox box;
  Process first = box.StartInstance();
  EXPECT_EQ(ConnectAsNobody(box.socketPath()), EACCES) << "the private directory stops them";

  // Everything opened up: the server still drops the connection before
  // reading its command.
  for (auto dir = std::filesystem::path(box.socketPath()).parent_path();
       dir.string().size() >= box.root().size(); dir = dir.parent_path())
    chmod(dir.c_str(), 0755);
  chmod(box.socketPath().c_str(), 0666);
  EXPECT_EQ(ConnectAsNobody(box.socketPath()), 0);
  ASSERT_TRUE(WaitFor([&] {
    return HasPrefix(first.Lines(),
                     "ERROR: DDE server connection of another user (uid 65534) refused");
  })) << Describe(first.Lines());

  // The owner is still served once the runtime directory is private again.
  chmod(box.runtimeDir().c_str(), 0700);
  EXPECT_EQ(box.Run({"owner"}).status, 255);
  ExpectEachOnce(first, {"owner"});
  EXPECT_EQ(Executed(first).count("intruder"), 0u);
  EXPECT_EQ(Count(first.Lines(), "INFO: DDE server OnAcceptConnection CommandLine"), 1)
      << "only the owner's conversation";
  first.Stop();
}

}  // namespace
