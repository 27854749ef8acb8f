// Running the real program in an isolated sandbox: its own HOME, runtime,
// cache and TeX trees, and a message log per process.
#pragma once

#include <fcntl.h>
#include <poll.h>
#include <pwd.h>
#include <signal.h>
#include <spawn.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <cstdint>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <functional>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include "test_support.h"

extern char** environ;

namespace e2e {

using Clock = std::chrono::steady_clock;
using std::chrono::milliseconds;

// Polls `done` every 10 ms until it holds or `limit` has passed.
inline bool WaitFor(const std::function<bool()>& done, milliseconds limit = milliseconds(15000)) {
  const auto end = Clock::now() + limit;
  for (;;) {
    if (done()) return true;
    if (Clock::now() >= end) return false;
    std::this_thread::sleep_for(milliseconds(10));
  }
}

struct LogLine {
  int level;
  std::string text;  // prefix + text
};

inline std::vector<LogLine> ReadLog(const std::string& path) {
  std::vector<LogLine> lines;
  std::ifstream in(path, std::ios::binary);
  std::string line;
  while (std::getline(in, line)) {
    const auto tab = line.find('\t');
    if (tab == std::string::npos) continue;
    lines.push_back({std::atoi(line.substr(0, tab).c_str()), line.substr(tab + 1)});
  }
  return lines;
}

inline int CountLines(const std::vector<LogLine>& log, const std::string& text) {
  int n = 0;
  for (const auto& l : log)
    if (l.text == text) ++n;
  return n;
}

inline bool HasLineStarting(const std::vector<LogLine>& log, const std::string& start) {
  for (const auto& l : log)
    if (l.text.compare(0, start.size(), start) == 0) return true;
  return false;
}

// True when `wanted` appear in the log in this order (other lines between).
inline bool InOrder(const std::vector<LogLine>& log, const std::vector<std::string>& wanted) {
  std::size_t next = 0;
  for (const auto& l : log)
    if (next < wanted.size() && l.text == wanted[next]) ++next;
  return next == wanted.size();
}

inline std::string Describe(const std::vector<LogLine>& log) {
  std::ostringstream out;
  for (const auto& l : log) out << l.level << '\t' << l.text << '\n';
  return out.str();
}

// Gives this test process an X display of its own when it has none (the
// test runner may start it without the display wrapper): an Xvfb server that
// picks its own number and ends with the process.
inline void EnsureDisplay() {
  static bool done = false;
  if (done) return;
  done = true;
  const char* display = std::getenv("DISPLAY");
  if (display != nullptr && *display != '\0') return;
  int pipeFds[2];
  if (pipe(pipeFds) != 0) return;
  const std::string fdText = std::to_string(pipeFds[1]);
  std::vector<std::string> args = {"Xvfb",         "-displayfd", fdText, "-screen", "0",
                                   "1600x1200x24", "-nolisten",  "tcp",  "-noreset"};
  std::vector<char*> argv;
  for (auto& a : args) argv.push_back(a.data());
  argv.push_back(nullptr);
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_addclose(&actions, pipeFds[0]);
  posix_spawn_file_actions_addopen(&actions, 1, "/dev/null", O_WRONLY, 0);
  posix_spawn_file_actions_addopen(&actions, 2, "/dev/null", O_WRONLY, 0);
  static pid_t server = -1;
  const int spawned = posix_spawnp(&server, "Xvfb", &actions, nullptr, argv.data(), environ);
  posix_spawn_file_actions_destroy(&actions);
  close(pipeFds[1]);
  std::string number;
  if (spawned == 0) {
    pollfd p{pipeFds[0], POLLIN, 0};
    char c;
    while (poll(&p, 1, 10000) > 0 && read(pipeFds[0], &c, 1) == 1 && c != '\n') number.push_back(c);
  }
  close(pipeFds[0]);
  if (number.empty()) return;
  setenv("DISPLAY", (":" + number).c_str(), 1);
  std::atexit([] {
    if (server > 0) {
      kill(server, SIGTERM);
      waitpid(server, nullptr, 0);
    }
  });
}

// A started program.
struct Process {
  pid_t pid = -1;
  std::string log;  // its TROVLIB_LOG
  int status = -1;  // exit status (or 128 + signal) once ended

  // Collects the process if it has ended; true while it runs.
  bool Running() {
    if (pid <= 0) return false;
    int raw = 0;
    const pid_t r = waitpid(pid, &raw, WNOHANG);
    if (r == 0) return true;
    if (r == pid)
      status = WIFEXITED(raw) ? WEXITSTATUS(raw) : WIFSIGNALED(raw) ? 128 + WTERMSIG(raw) : -1;
    pid = -1;
    return false;
  }
  // The exit status, -1 when it did not end in time.
  int Wait(milliseconds limit = milliseconds(20000)) {
    if (!WaitFor([&] { return !Running(); }, limit)) return -1;
    return status;
  }
  void Kill(int signal = SIGKILL) {
    if (!Running()) return;
    kill(pid, signal);
    if (Wait(milliseconds(5000)) < 0 && Running()) {
      kill(pid, SIGKILL);
      Wait(milliseconds(5000));
    }
  }
  void Stop() { Kill(SIGTERM); }
  std::vector<LogLine> Log() const { return ReadLog(log); }
};

// An isolated home for the program; every process started from it is
// stopped when it goes.
class Sandbox {
 public:
  Sandbox() {
    EnsureDisplay();
    home_ = dir_ / "home";
    runtime_ = dir_ / "run";
    cache_ = dir_ / "cache";
    texmf_ = dir_ / "texmf";
    for (const auto& d : {home_, runtime_, cache_}) std::filesystem::create_directories(d);
    chmod(runtime_.c_str(), 0700);
    std::filesystem::copy(DOCUVANE_SAMPLE_TREE, texmf_, std::filesystem::copy_options::recursive);
  }
  // A sandbox whose runtime directory is given (for over-long paths).
  explicit Sandbox(const std::string& runtimeBelow) : Sandbox() {
    runtime_ = dir_ / runtimeBelow;
    std::filesystem::create_directories(runtime_);
    chmod(runtime_.c_str(), 0700);
  }
  ~Sandbox() {
    // Only children not collected yet: a collected pid may belong to
    // someone else by now.
    for (const pid_t pid : started_) {
      if (waitpid(pid, nullptr, WNOHANG) != 0) continue;
      kill(pid, SIGKILL);
      waitpid(pid, nullptr, 0);
    }
  }
  Sandbox(const Sandbox&) = delete;
  Sandbox& operator=(const Sandbox&) = delete;

  const std::string& root() const { return dir_.path(); }
  std::string runtimeDir() const { return runtime_ + "/lomari"; }
  std::string socketPath() const { return runtimeDir() + "/Lomari.DDE.Docuvane"; }
  // The program names the lock after the user's login name.
  std::string lockPath() const {
    const passwd* entry = getpwuid(geteuid());
    return runtimeDir() + "/Lomari-Docuvane-" + (entry ? entry->pw_name : "") + ".lock";
  }

  // Starts the program with `args`; its messages go to a log of its own.
  Process Start(const std::vector<std::string>& args) {
    Process p;
    p.log = dir_ / ("log-" + std::to_string(++count_));
    const std::string out = p.log + ".out";
    std::vector<std::string> env = {
        "HOME=" + home_,
        "XDG_RUNTIME_DIR=" + runtime_,
        "XDG_CACHE_HOME=" + cache_,
        "XDG_CONFIG_HOME=" + home_ + "/.config",
        "TEXMF=" + texmf_,
        "TROVLIB_LOG=" + p.log,
        "TROVLIB_STDERR_LEVEL=6",
        "LC_ALL=C.UTF-8",
        "NO_AT_BRIDGE=1",
        "GDK_BACKEND=x11",
        "DBUS_SESSION_BUS_ADDRESS=unix:path=/nonexistent",
        "PATH=/usr/bin:/bin",
    };
    for (const char* name : {"DISPLAY", "USER", "LOGNAME"})
      if (const char* v = std::getenv(name)) env.push_back(std::string(name) + "=" + v);
    std::vector<char*> envp;
    for (auto& e : env) envp.push_back(e.data());
    envp.push_back(nullptr);
    std::vector<std::string> argvStrings = {DOCUVANE_PROGRAM};
    argvStrings.insert(argvStrings.end(), args.begin(), args.end());
    std::vector<char*> argv;
    for (auto& a : argvStrings) argv.push_back(a.data());
    argv.push_back(nullptr);

    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addopen(&actions, 1, out.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
    posix_spawn_file_actions_adddup2(&actions, 1, 2);
    if (posix_spawn(&p.pid, DOCUVANE_PROGRAM, &actions, nullptr, argv.data(), envp.data()) != 0)
      p.pid = -1;
    posix_spawn_file_actions_destroy(&actions);
    if (p.pid > 0) started_.push_back(p.pid);
    return p;
  }

  // Starts the first instance and waits until it serves commands.
  Process StartInstance(const std::vector<std::string>& args = {}) {
    Process p = Start(args);
    WaitFor([&] {
      return HasLineStarting(p.Log(), "Docuvane: Docuvane::OnInit --- Parse_Command_Line");
    });
    return p;
  }

  // Runs a later start to its end; returns it, ended (status -1: it hung).
  Process Run(const std::vector<std::string>& args, milliseconds limit = milliseconds(20000)) {
    Process p = Start(args);
    p.Wait(limit);
    return p;
  }

 private:
  testing_support::TempDir dir_;
  std::string home_, runtime_, cache_, texmf_;
  std::vector<pid_t> started_;
  int count_ = 0;
};

// The framework's IPC wire format, spoken by hand: a client that can do
// what the program's own client never does (or does wrong on purpose).
class RawChannel {
 public:
  enum Code : unsigned char {
    kExecute = 1,
    kRequest = 2,
    kPoke = 3,
    kAdviseStart = 4,
    kAdviseStop = 7,
    kRequestReply = 8,
    kFail = 9,
    kConnect = 10,
    kDisconnect = 11,
  };
  static constexpr unsigned char kText = 1;

  ~RawChannel() { Close(); }
  bool Connect(const std::string& path) {
    fd_ = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::strncpy(address.sun_path, path.c_str(), sizeof address.sun_path - 1);
    error_ = 0;
    if (connect(fd_, reinterpret_cast<sockaddr*>(&address), sizeof address) != 0) {
      error_ = errno;
      Close();
      return false;
    }
    return true;
  }
  int error() const { return error_; }
  void Close() {
    if (fd_ >= 0) close(fd_);
    fd_ = -1;
  }

  void Byte(unsigned char b) { out_.push_back(static_cast<char>(b)); }
  void Length(std::uint32_t n) {
    for (int i = 0; i < 4; ++i) Byte(static_cast<unsigned char>(n >> (8 * i)));
  }
  void String(const std::string& s) {
    Length(static_cast<std::uint32_t>(s.size()));
    out_ += s;
  }
  void Raw(const std::string& bytes) { out_ += bytes; }
  bool Flush() {
    const bool ok =
        send(fd_, out_.data(), out_.size(), MSG_NOSIGNAL) == static_cast<ssize_t>(out_.size());
    out_.clear();
    return ok;
  }

  // Opens a conversation on `topic`; the server's answer code, or -1.
  int Open(const std::string& topic) {
    Byte(kConnect);
    String(topic);
    Flush();
    return ReadByte();
  }
  void Execute(const std::string& text) {
    Byte(kExecute);
    Byte(kText);
    Length(static_cast<std::uint32_t>(text.size() + 1));
    out_ += text;
    out_.push_back('\0');
    Flush();
  }
  // The reply of a request, or nothing (with the answer code in `code`).
  bool Request(const std::string& item, std::string* reply, int* code) {
    Byte(kRequest);
    String(item);
    Byte(kText);
    Flush();
    *code = ReadByte();
    if (*code != kRequestReply) return false;
    std::uint32_t size = 0;
    for (int i = 0; i < 4; ++i) {
      const int b = ReadByte();
      if (b < 0) return false;
      size |= static_cast<std::uint32_t>(b) << (8 * i);
    }
    reply->clear();
    for (std::uint32_t i = 0; i < size; ++i) {
      const int b = ReadByte();
      if (b < 0) return false;
      reply->push_back(static_cast<char>(b));
    }
    return true;
  }
  void Disconnect() {
    Byte(kDisconnect);
    Flush();
  }

  // One byte from the server within 5 s; -1 on end, error or time-out.
  int ReadByte() {
    pollfd p{fd_, POLLIN, 0};
    if (poll(&p, 1, 5000) <= 0) return -1;
    unsigned char b;
    return recv(fd_, &b, 1, 0) == 1 ? b : -1;
  }

 private:
  int fd_ = -1;
  int error_ = 0;
  std::string out_;
};

}  // namespace e2e
