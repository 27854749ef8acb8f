// The real program in a sandbox: own HOME, runtime, cache, TeX trees and logs.
#pragma once

#include <fcntl.h>
#include <pwd.h>
#include <signal.h>
#include <spawn.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <cstdint>
#include <functional>
#include <thread>

#include "command/wire.h"
#include "platform/socket_posix.h"
#include "test_support.h"  // also filesystem, fstream, string, vector

namespace e2e {

using Clock = std::chrono::steady_clock;
using std::chrono::milliseconds;

inline bool WaitFor(const std::function<bool()>& done, milliseconds limit = milliseconds(15000)) {
  for (const auto end = Clock::now() + limit; !done();
       std::this_thread::sleep_for(milliseconds(10)))
    if (Clock::now() >= end) return false;
  return true;
}

struct LogLine {
  int level;
  std::string text;
};
using Log = std::vector<LogLine>;

inline int Count(const Log& log, const std::string& text, int level = -1) {
  int n = 0;
  for (const auto& l : log) n += l.text == text && (level < 0 || l.level == level);
  return n;
}
inline bool HasPrefix(const Log& log, const std::string& start) {
  for (const auto& l : log)
    if (l.text.compare(0, start.size(), start) == 0) return true;
  return false;
}
inline bool InOrder(const Log& log, const std::vector<std::string>& wanted) {  // others between
  std::size_t next = 0;
  for (const auto& l : log) next += next < wanted.size() && l.text == wanted[next];
  return next == wanted.size();
}
inline std::string Describe(const Log& log) {
  std::string out;
  for (const auto& l : log) out += std::to_string(l.level) + '\t' + l.text + '\n';
  return out;
}
inline std::string FileText(const std::string& path) {
  std::ifstream in(path, std::ios::binary);
  return std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

struct Process {
  pid_t pid = -1;
  std::string log;  // its TROVLIB_LOG
  int status = -1;  // exit status (or 128 + signal) once ended

  bool Running() {  // collects the process once it has ended
    int raw = 0;
    if (pid <= 0 || waitpid(pid, &raw, WNOHANG) == 0) return pid > 0;
    status = WIFEXITED(raw) ? WEXITSTATUS(raw) : 128 + WTERMSIG(raw);
    pid = -1;
    return false;
  }
  int Wait(milliseconds limit = milliseconds(20000)) {  // -1: not ended in time
    return WaitFor([&] { return !Running(); }, limit) ? status : -1;
  }
  void Stop(int signal = SIGTERM) {
    if (Running()) kill(pid, signal);
    Wait();
  }
  std::string Output() const { return FileText(log + ".out"); }  // standard output and error
  long PeakKiB() const {                                         // peak resident memory
    const std::string status = FileText("/proc/" + std::to_string(pid) + "/status");
    const std::size_t at = status.find("VmHWM:");
    return at == std::string::npos ? 0 : std::atol(status.c_str() + at + 6);
  }
  Log Lines() const {
    Log lines;
    std::ifstream in(log, std::ios::binary);
    for (std::string line; std::getline(in, line);)
      if (const auto tab = line.find('\t'); tab != std::string::npos)
        lines.push_back({std::atoi(line.c_str()), line.substr(tab + 1)});
    return lines;
  }
};

// Every process started from a sandbox is killed when it goes.
class Sandbox {
 public:
  Sandbox() {
    for (const auto& d : {home_, runtime_, cache_}) std::filesystem::create_directories(d);
    chmod(runtime_.c_str(), 0700);
    std::filesystem::copy(DOCUVANE_SAMPLE_TREE, texmf_, std::filesystem::copy_options::recursive);
  }
  ~Sandbox() {
    for (const pid_t pid : started_)
      if (waitpid(pid, nullptr, WNOHANG) == 0) kill(pid, SIGKILL), waitpid(pid, nullptr, 0);
  }
  const std::string& root() const { return dir_.path(); }
  const std::string& home() const { return home_; }
  std::string runtimeDir() const { return runtime_ + "/lomari"; }
  std::string socketPath() const { return runtimeDir() + "/Lomari.DDE.Docuvane"; }
  std::string lockName() const {
    const passwd* entry = getpwuid(geteuid());
    return std::string("Lomari-Docuvane-") + (entry ? entry->pw_name : "");
  }
  // `changes` to the environment are "NAME=value" (set) or "NAME" (left out).
  Process Start(const std::vector<std::string>& args,
                const std::vector<std::string>& changes = {}) {
    Process p;
    p.log = dir_ / ("log-" + std::to_string(started_.size()));
    // clang-format off
    std::vector<std::string> env = {
        "HOME=" + home_, "XDG_RUNTIME_DIR=" + runtime_, "XDG_CACHE_HOME=" + cache_,
        "XDG_CONFIG_HOME=" + home_ + "/.config", "TEXMF=" + texmf_, "TROVLIB_LOG=" + p.log,
        "TROVLIB_STDERR_LEVEL=6", "LC_ALL=C.UTF-8", "NO_AT_BRIDGE=1", "GDK_BACKEND=x11",
        "DBUS_SESSION_BUS_ADDRESS=unix:path=/nonexistent", "PATH=/usr/bin:/bin"};
    // clang-format on
    for (const char* name : {"DISPLAY", "USER", "LOGNAME"})
      if (const char* v = std::getenv(name)) env.push_back(std::string(name) + "=" + v);
    for (const std::string& change : changes) {
      const std::string name = change.substr(0, change.find('=')) + "=";
      for (auto it = env.begin(); it != env.end();)
        it = it->compare(0, name.size(), name) == 0 ? env.erase(it) : it + 1;
      if (change.find('=') != std::string::npos) env.push_back(change);
    }
    std::vector<std::string> argv = {DOCUVANE_PROGRAM};
    argv.insert(argv.end(), args.begin(), args.end());
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addopen(&actions, 1, (p.log + ".out").c_str(),
                                     O_WRONLY | O_CREAT | O_TRUNC, 0644);
    posix_spawn_file_actions_adddup2(&actions, 1, 2);
    if (posix_spawn(&p.pid, DOCUVANE_PROGRAM, &actions, nullptr, Pointers(argv).data(),
                    Pointers(env).data()))
      p.pid = -1;
    posix_spawn_file_actions_destroy(&actions);
    started_.push_back(p.pid);
    return p;
  }
  // Starts an instance and waits until it serves commands.
  Process StartInstance(const std::vector<std::string>& args = {}) {
    Process p = Start(args);
    WaitFor(
        [&] { return HasPrefix(p.Lines(), "Docuvane: Docuvane::OnInit --- Parse_Command_Line"); });
    return p;
  }
  // Runs a later start to its end (status -1: it hung).
  Process Run(const std::vector<std::string>& args, const std::vector<std::string>& changes = {}) {
    Process p = Start(args, changes);
    p.Wait(milliseconds(30000));
    return p;
  }

 private:
  static std::vector<char*> Pointers(std::vector<std::string>& strings) {
    std::vector<char*> pointers;
    for (auto& s : strings) pointers.push_back(s.data());
    pointers.push_back(nullptr);
    return pointers;
  }

  testing_support::TempDir dir_;
  std::string home_ = dir_ / "home", runtime_ = dir_ / "run", cache_ = dir_ / "cache",
              texmf_ = dir_ / "texmf";
  std::vector<pid_t> started_;
};

// The toolkit's IPC wire format spoken by hand, as the program's client never would.
class RawChannel {
 public:
  static constexpr int kRequest = 2, kAdviseStart = 4, kRequestReply = 8, kFail = 9, kConnect = 10,
                       kDisconnect = 11;
  static std::string Length(std::uint32_t n) { return wire::Length(n); }
  static std::string Text(const std::string& s) { return wire::Name(s); }
  ~RawChannel() { Close(); }
  bool Connect(const std::string& path) {
    bool refused;
    return (fd_ = ConnectTo(path, &refused, nullptr)) >= 0;
  }
  void Close() { fd_ = fd_ >= 0 ? close(fd_), -1 : -1; }
  void Send(char code, const std::string& rest) { WriteAll(fd_, code + rest, 1000); }
  int ReadByte() {  // one byte within 5 s; -1 on end, error or time-out
    char b;
    return WaitReadable(fd_, 5000) == 1 && ReadArrived(fd_, &b, 1) == 1 ? b & 0xFF : -1;
  }
  int Open(const std::string& topic) { return Send(kConnect, Text(topic)), ReadByte(); }
  // The answer code of a request; the reply's bytes go to `reply`.
  int Request(const std::string& item, std::string* reply, char format = 1) {
    Send(kRequest, Text(item) + format);
    const int code = ReadByte();
    std::uint32_t size = 0;
    for (int i = 0, b = 0; code == kRequestReply && i < 4 && (b = ReadByte()) >= 0; ++i)
      size |= std::uint32_t(b) << (8 * i);
    for (int b = 0; reply->size() < size && (b = ReadByte()) >= 0;) reply->push_back(char(b));
    return code;
  }

 private:
  int fd_ = -1;
};

}  // namespace e2e
