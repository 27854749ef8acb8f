// The command channel between a running instance and later starts.
#include <grp.h>
#include <gtest/gtest.h>

#include <map>

#include "e2e_support.h"
#include "platform/instance_lock.h"

namespace {

using namespace e2e;

std::string Word(int i) {
  char buf[16];
  std::snprintf(buf, sizeof buf, "w%04d", i);
  return buf;
}

// How often each word reached the instance's command processing.
std::map<std::string, int> Executed(const std::vector<LogLine>& log) {
  std::map<std::string, int> seen;
  const std::string prefix = "INFO: DDE server Execute ";
  for (const auto& l : log)
    if (l.text.compare(0, prefix.size(), prefix) == 0) ++seen[l.text.substr(prefix.size())];
  return seen;
}

TEST(CommandChannel, ServerMessagesOfOneForwardedCommandInOrder) {
  Sandbox box;
  Process first = box.StartInstance();
  Process second = box.Run({"\\section"});
  ASSERT_EQ(second.status, 255);
  ASSERT_TRUE(
      WaitFor([&] { return HasLineStarting(first.Log(), "INFO: DDE server OnDisconnect()"); }));
  const auto log = first.Log();
  EXPECT_TRUE(
      InOrder(log, {"INFO: DDE server OnAcceptConnection CommandLine",
                    "INFO: DDE server Connection accepted", "INFO: DDE server Execute \\section",
                    "Docuvane: Search Keyword: \\section", "INFO: DDE server OnDisconnect()"}))
      << Describe(log);
  for (const auto& l : log)
    if (l.text.compare(0, 16, "INFO: DDE server") == 0) {
      EXPECT_EQ(l.level, 2) << l.text;
    }
  first.Stop();
}

TEST(CommandChannel, HostileCommandsAreCarriedWithoutHarm) {
  Sandbox box;
  Process first = box.StartInstance();
  const std::string marker = box.root() + "/shell-ran";
  struct Row {
    const char* what;
    std::vector<std::string> args;
    std::string arrives;  // the text the server executes
  };
  const std::vector<Row> rows = {
      {"empty", {""}, ""},
      {"only a question mark", {"?"}, "?"},
      {"quotes and blanks", {"say \"hi\" there"}, "\"say \"hi\" there\""},
      {"shell characters",
       {"$(touch " + marker + ");`touch " + marker + "`"},
       "\"$(touch " + marker + ");`touch " + marker + "`\""},
      {"10,000 characters arrive cut to 1023", {std::string(10000, 'z')}, std::string(1023, 'z')},
      {"a topic in lower case with marks", {"?#.lmr.nothing"}, "?#.lmr.nothing"},
  };
  for (const Row& row : rows) {
    Process later = box.Run(row.args);
    EXPECT_EQ(later.status, 255) << row.what;
    EXPECT_TRUE(WaitFor([&] { return Executed(first.Log())[row.arrives] >= 1; })) << row.what;
    ASSERT_TRUE(first.Running()) << row.what;
  }
  // Invalid UTF-8 cannot become a wide argument; whatever arrives, the
  // instance stays up and answers the next command.
  Process odd = box.Run({"\xff\xfe\x80 bad"});
  EXPECT_EQ(odd.status, 255);
  Process after = box.Run({"after-odd"});
  EXPECT_TRUE(WaitFor([&] { return Executed(first.Log())["after-odd"] == 1; }))
      << Describe(first.Log());
  EXPECT_TRUE(first.Running());
  EXPECT_FALSE(std::filesystem::exists(marker)) << "a command must never reach a shell";
  first.Stop();
}

TEST(CommandChannel, HundredLaterStartsInARowEachProcessedOnce) {
  Sandbox box;
  Process first = box.StartInstance();
  for (int i = 0; i < 100; ++i) {
    Process later = box.Run({Word(i)});
    ASSERT_EQ(later.status, 255) << Word(i) << Describe(later.Log());
  }
  ASSERT_TRUE(WaitFor([&] { return Executed(first.Log()).size() == 100; }))
      << Describe(first.Log());
  const auto seen = Executed(first.Log());
  for (int i = 0; i < 100; ++i) EXPECT_EQ(seen.count(Word(i)) ? seen.at(Word(i)) : 0, 1) << Word(i);
  EXPECT_TRUE(first.Running());
  first.Stop();
}

TEST(CommandChannel, FiftyLaterStartsAtOnceEachProcessedOnce) {
  Sandbox box;
  Process first = box.StartInstance();
  std::vector<Process> later;
  for (int i = 0; i < 50; ++i) later.push_back(box.Start({Word(i)}));
  for (auto& p : later)
    EXPECT_EQ(p.Wait(std::chrono::milliseconds(60000)), 255) << Describe(p.Log());
  ASSERT_TRUE(WaitFor([&] { return Executed(first.Log()).size() == 50; })) << Describe(first.Log());
  const auto seen = Executed(first.Log());
  for (int i = 0; i < 50; ++i) EXPECT_EQ(seen.count(Word(i)) ? seen.at(Word(i)) : 0, 1) << Word(i);
  EXPECT_EQ(CountLines(first.Log(), "INFO: DDE server OnDisconnect()"), 50);
  first.Stop();
}

TEST(CommandChannel, TenColdStartsGiveOneInstanceAndNineForwardedCommands) {
  Sandbox box;
  std::vector<Process> starts;
  for (int i = 0; i < 10; ++i) starts.push_back(box.Start({Word(i)}));
  // Nine end; one stays.
  ASSERT_TRUE(WaitFor(
      [&] {
        int running = 0;
        for (auto& p : starts) running += p.Running() ? 1 : 0;
        return running <= 1;
      },
      std::chrono::milliseconds(60000)));
  int survivor = -1;
  for (int i = 0; i < 10; ++i) {
    if (starts[i].Running()) {
      EXPECT_EQ(survivor, -1) << "two instances run";
      survivor = i;
    } else {
      EXPECT_EQ(starts[i].status, 255) << Word(i) << Describe(starts[i].Log());
    }
  }
  ASSERT_GE(survivor, 0) << "no instance runs";
  Process& instance = starts[static_cast<std::size_t>(survivor)];
  ASSERT_TRUE(WaitFor([&] { return Executed(instance.Log()).size() == 9; }))
      << Describe(instance.Log());
  const auto seen = Executed(instance.Log());
  for (int i = 0; i < 10; ++i)
    if (i != survivor) {
      EXPECT_EQ(seen.count(Word(i)) ? seen.at(Word(i)) : 0, 1) << Word(i);
    }
  EXPECT_EQ(CountLines(instance.Log(), "Docuvane: Search Keyword: " + Word(survivor)), 1);
  instance.Stop();
}

TEST(CommandChannel, RequestItemsAdviseAndPoke) {
  Sandbox box;
  Process first = box.StartInstance();
  RawChannel channel;
  ASSERT_TRUE(channel.Connect(box.socketPath()));
  ASSERT_EQ(channel.Open("CommandLine"), RawChannel::kConnect);

  struct Row {
    const char* what;
    std::string item;
    bool answered;
  };
  const Row rows[] = {
      {"date and time", "Date", true},   {"time, blank, date with its length", "Date+len", true},
      {"three bytes", "bytes[3]", true}, {"Date with other text", "Date+x", false},
      {"case counts", "date", false},    {"unknown", "nothing", false}};
  std::map<std::string, std::string> replies;
  for (const Row& row : rows) {
    std::string reply;
    int code = 0;
    EXPECT_EQ(channel.Request(row.item, &reply, &code), row.answered) << row.what;
    EXPECT_EQ(code, row.answered ? RawChannel::kRequestReply : RawChannel::kFail) << row.what;
    replies[row.item] = reply;
  }
  // "Date": the text measured by the transport, its NUL included.
  ASSERT_FALSE(replies["Date"].empty());
  EXPECT_EQ(replies["Date"].back(), '\0');
  EXPECT_EQ(std::strlen(replies["Date"].c_str()) + 1, replies["Date"].size());
  // "Date+len": time, one blank, date; the size counts the NUL.
  const std::string withLength = replies["Date+len"];
  ASSERT_FALSE(withLength.empty());
  EXPECT_EQ(withLength.back(), '\0');
  EXPECT_EQ(std::strlen(withLength.c_str()) + 1, withLength.size());
  EXPECT_NE(withLength.find(':'), std::string::npos) << withLength;
  EXPECT_LT(withLength.find(':'), withLength.find(' ')) << "time first: " << withLength;
  EXPECT_EQ(replies["bytes[3]"], "123");

  // Advise loops are recorded; pokes are refused without an answer.
  channel.Byte(RawChannel::kAdviseStart);
  channel.String("Loop");
  channel.Flush();
  EXPECT_EQ(channel.ReadByte(), RawChannel::kAdviseStart);
  channel.Byte(RawChannel::kAdviseStop);
  channel.String("Loop");
  channel.Flush();
  EXPECT_EQ(channel.ReadByte(), RawChannel::kAdviseStop);
  channel.Byte(RawChannel::kPoke);
  channel.String("Item");
  channel.Byte(RawChannel::kText);
  channel.Length(2);
  channel.Raw(std::string("x", 2));
  channel.Flush();
  channel.Disconnect();

  ASSERT_TRUE(
      WaitFor([&] { return HasLineStarting(first.Log(), "INFO: DDE server OnDisconnect()"); }));
  const auto log = first.Log();
  EXPECT_EQ(CountLines(log, "INFO: DDE server OnRequest..."), 3) << Describe(log);
  for (const char* item : {"Date+x", "date", "nothing"}) {
    const std::string line = std::string("ERROR: DDE server Unknown requestOnExecute ") + item;
    EXPECT_EQ(CountLines(log, line), 1) << line;
    for (const auto& l : log)
      if (l.text == line) {
        EXPECT_EQ(l.level, 2);
      }
  }
  EXPECT_TRUE(
      InOrder(log, {"INFO: DDE server OnStartAdvise Loop", "INFO: DDE server OnStopAdvise Loop",
                    "INFO: DDE server OnPoke...", "INFO: DDE server OnDisconnect()"}))
      << Describe(log);
  EXPECT_TRUE(first.Running());
  first.Stop();
}

TEST(CommandChannel, OnlyTheCommandLineTopicIsAccepted) {
  Sandbox box;
  Process first = box.StartInstance();
  for (const std::string topic : {"Other", "commandline", "CommandLine ", ""}) {
    RawChannel channel;
    ASSERT_TRUE(channel.Connect(box.socketPath()));
    EXPECT_EQ(channel.Open(topic), RawChannel::kFail) << topic;
    const std::string line = "INFO: DDE server OnAcceptConnection " + topic;
    ASSERT_TRUE(WaitFor([&] { return CountLines(first.Log(), line) == 1; })) << topic;
  }
  const auto log = first.Log();
  int refusals = 0;
  for (const auto& l : log)
    if (l.text == "ERROR: DDE server Unknown topic, connection refused") {
      ++refusals;
      EXPECT_EQ(l.level, 5);
    }
  EXPECT_EQ(refusals, 4);
  EXPECT_EQ(CountLines(log, "INFO: DDE server Connection accepted"), 0);
  first.Stop();
}

TEST(CommandChannel, SilentClientHoldsTheWindowOnlyBriefly) {
  Sandbox box;
  Process first = box.StartInstance();
  RawChannel silent;
  ASSERT_TRUE(silent.Connect(box.socketPath()));
  const auto sent = Clock::now();
  Process later = box.Run({"after-silence"});
  EXPECT_EQ(later.status, 255);
  ASSERT_TRUE(WaitFor([&] { return Executed(first.Log())["after-silence"] == 1; }));
  EXPECT_LT(Clock::now() - sent, std::chrono::milliseconds(6000));
  EXPECT_TRUE(HasLineStarting(first.Log(), "WARNING: DDE server client sent no request"))
      << Describe(first.Log());
  // The silent client's connection has been closed by the server.
  EXPECT_EQ(silent.ReadByte(), -1);
  first.Stop();
}

TEST(CommandChannel, RecoveryAfterTheInstanceIsKilled) {
  struct Row {
    const char* what;
    std::function<std::string(Sandbox&)> lockContent;  // NULL: leave the file as it is
  };
  const std::vector<Row> rows = {
      {"stale socket, lock file as left", nullptr},
      {"empty lock file", [](Sandbox&) { return std::string(); }},
      {"lock file naming a live process of this user",
       [](Sandbox&) { return std::to_string(getpid()) + "\n"; }},
  };
  for (const Row& row : rows) {
    Sandbox box;
    Process killed = box.StartInstance();
    ASSERT_TRUE(killed.Running()) << row.what;
    killed.Kill(SIGKILL);
    ASSERT_TRUE(std::filesystem::exists(box.socketPath())) << "a killed instance leaves its socket";
    if (row.lockContent) {
      std::ofstream lock(box.lockPath(), std::ios::trunc);
      lock << row.lockContent(box);
    }
    Process next = box.StartInstance({"again"});
    ASSERT_TRUE(next.Running()) << row.what;
    EXPECT_EQ(CountLines(next.Log(), "INFO: DDE server started Lomari.DDE.Docuvane"), 1)
        << row.what;
    Process later = box.Run({"served"});
    EXPECT_EQ(later.status, 255) << row.what;
    EXPECT_TRUE(WaitFor([&] { return Executed(next.Log())["served"] == 1; }))
        << row.what << Describe(next.Log());
    next.Stop();
  }
}

TEST(CommandChannel, LaterStartNeverHangsOnAStuckInstance) {
  struct Row {
    const char* what;
    bool listening;  // a socket that takes connections but never answers
    const char* error;
  };
  const Row rows[] = {
      {"an instance that holds the lock and never answers", true,
       "ERROR: DDE client no answer from the server"},
      {"an instance that holds the lock but has no socket", false, nullptr},
  };
  for (const Row& row : rows) {
    Sandbox box;
    // Stand in for a running instance: hold its lock (and its socket).
    std::filesystem::create_directories(box.runtimeDir());
    chmod(box.runtimeDir().c_str(), 0700);
    InstanceLock lock;
    const std::string lockFile = std::filesystem::path(box.lockPath()).filename().string();
    ASSERT_TRUE(lock.Create(lockFile.substr(0, lockFile.size() - 5), box.runtimeDir())) << row.what;
    int listener = -1;
    if (row.listening) {
      listener = socket(AF_UNIX, SOCK_STREAM, 0);
      sockaddr_un address{};
      address.sun_family = AF_UNIX;
      std::strncpy(address.sun_path, box.socketPath().c_str(), sizeof address.sun_path - 1);
      ASSERT_EQ(bind(listener, reinterpret_cast<sockaddr*>(&address), sizeof address), 0);
      ASSERT_EQ(listen(listener, 5), 0);
    }
    const auto start = Clock::now();
    Process later = box.Run({"lost"}, std::chrono::milliseconds(30000));
    const auto took = Clock::now() - start;
    EXPECT_EQ(later.status, 255) << row.what;
    EXPECT_LT(took, std::chrono::milliseconds(15000)) << row.what;
    const auto own = later.Log();
    EXPECT_TRUE(HasLineStarting(own, "INFO: Connection Client host=\"localhost\""))
        << Describe(own);
    EXPECT_EQ(own.back().text.find("failed to connect") != std::string::npos, true)
        << Describe(own);
    if (row.error) {
      EXPECT_EQ(CountLines(own, row.error), 1) << Describe(own);
    }
    if (listener >= 0) close(listener);
  }
}

// Connects as the user `nobody` and tries to run a command.
void ConnectAsNobody(const std::string& socketPath, int* connectError, bool* answered) {
  int report[2];
  ASSERT_EQ(pipe(report), 0);
  const pid_t child = fork();
  if (child == 0) {
    close(report[0]);
    int result[2] = {0, 0};
    if (setgroups(0, nullptr) != 0 || setgid(65534) != 0 || setuid(65534) != 0) _exit(3);
    RawChannel channel;
    if (!channel.Connect(socketPath)) {
      result[0] = channel.error();
    } else {
      const int code = channel.Open("CommandLine");
      result[1] = code == RawChannel::kConnect ? 1 : 0;
      channel.Execute("intruder");
    }
    if (write(report[1], result, sizeof result) != sizeof result) _exit(4);
    _exit(0);
  }
  close(report[1]);
  int result[2] = {-1, -1};
  const ssize_t got = read(report[0], result, sizeof result);
  close(report[0]);
  int status = 0;
  waitpid(child, &status, 0);
  ASSERT_EQ(got, static_cast<ssize_t>(sizeof result));
  *connectError = result[0];
  *answered = result[1] == 1;
}

TEST(CommandChannel, OtherUsersAreRefused) {
  if (geteuid() != 0) GTEST_SKIP() << "needs root to switch to another user";
  Sandbox box;
  Process first = box.StartInstance();

  // As installed: the private directory stops them.
  int error = 0;
  bool answered = false;
  ConnectAsNobody(box.socketPath(), &error, &answered);
  EXPECT_EQ(error, EACCES);
  EXPECT_FALSE(answered);

  // Everything opened up: the server itself still drops the connection
  // before reading its command.
  for (std::string dir = box.socketPath(); dir.size() > 1;) {
    dir = std::filesystem::path(dir).parent_path().string();
    if (dir.size() < box.root().size()) break;
    chmod(dir.c_str(), 0755);
  }
  chmod(box.socketPath().c_str(), 0666);
  ConnectAsNobody(box.socketPath(), &error, &answered);
  EXPECT_EQ(error, 0);
  EXPECT_FALSE(answered);
  ASSERT_TRUE(WaitFor([&] {
    return HasLineStarting(first.Log(),
                           "ERROR: DDE server connection of another user (uid 65534) refused");
  })) << Describe(first.Log());

  // The owner is still served (once the runtime directory is private
  // again, which a start insists on), and the intruder's command never ran.
  chmod(box.runtimeDir().c_str(), 0700);
  Process later = box.Run({"owner"});
  EXPECT_TRUE(WaitFor([&] { return Executed(first.Log())["owner"] == 1; }));
  EXPECT_EQ(Executed(first.Log()).count("intruder"), 0u);
  EXPECT_EQ(CountLines(first.Log(), "INFO: DDE server OnAcceptConnection CommandLine"), 1)
      << "only the owner's conversation";
  first.Stop();
}

}  // namespace
