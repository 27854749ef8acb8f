// The command channel's client side.
#include "command/client_gui.h"

#include <dirent.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>
#include <wx/log.h>

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <mutex>
#include <thread>

#include "text/wxtext_gui.h"
#include "command/server_gui.h"
#include "trovlib/trovlib.h"

namespace {

using Clock = std::chrono::steady_clock;
using std::chrono::milliseconds;

const char* const kHost = "localhost";

// A start that meets an instance still building its window finds no socket
// yet; a start that meets a full listen queue (many starts at once on a busy
// machine) is refused for a while.  Both try again after a short pause,
// within this bound.  (A socket left by a dead instance is no reason to
// stop early: the lock is free then, and the start becomes the instance.)
constexpr milliseconds kRetryPause(100);
constexpr milliseconds kConnectBudget(8000);
// Longest wait for any one answer of the server.  It answers at once when
// idle; dozens of starts at once on a busy machine queue up behind each
// other for a few seconds; longer means it is stuck.
constexpr milliseconds kAnswerLimit(5000);

void Message(const char* prefix, const char* text, int level = 2) {
  TrovMessage(prefix, text, level);
}

// Ends a wait of the framework on the server by shutting the client's
// socket down from another thread when an answer takes too long; the
// framework then sees a lost connection instead of waiting ten minutes.
class AnswerWatchdog {
 public:
  explicit AnswerWatchdog(std::string socketPath)
      : path_(std::move(socketPath)), thread_([this] { Run(); }) {}
  ~AnswerWatchdog() {
    {
      std::lock_guard<std::mutex> hold(mutex_);
      stop_ = true;
    }
    wake_.notify_all();
    thread_.join();
  }
  AnswerWatchdog(const AnswerWatchdog&) = delete;
  AnswerWatchdog& operator=(const AnswerWatchdog&) = delete;

  void Arm() {
    std::lock_guard<std::mutex> hold(mutex_);
    deadline_ = Clock::now() + kAnswerLimit;
    armed_ = true;
    wake_.notify_all();
  }
  void Disarm() {
    std::lock_guard<std::mutex> hold(mutex_);
    armed_ = false;
  }
  bool Fired() const { return fired_.load(); }

 private:
  void Run() {
    std::unique_lock<std::mutex> hold(mutex_);
    while (!stop_) {
      if (!armed_) {
        wake_.wait(hold);
        continue;
      }
      if (wake_.wait_until(hold, deadline_) == std::cv_status::timeout && armed_ && !stop_ &&
          Clock::now() >= deadline_) {
        armed_ = false;
        fired_ = true;
        ShutDownSocketsTo(path_);
      }
    }
  }

  static void ShutDownSocketsTo(const std::string& path) {
    DIR* fds = opendir("/proc/self/fd");
    if (fds == nullptr) return;
    while (dirent* entry = readdir(fds)) {
      char* end = nullptr;
      const long fd = std::strtol(entry->d_name, &end, 10);
      if (end == entry->d_name || *end != '\0' || fd == dirfd(fds)) continue;
      struct stat st;
      if (fstat(static_cast<int>(fd), &st) != 0 || !S_ISSOCK(st.st_mode)) continue;
      sockaddr_un peer{};
      socklen_t length = sizeof peer;
      if (getpeername(static_cast<int>(fd), reinterpret_cast<sockaddr*>(&peer), &length) != 0 ||
          peer.sun_family != AF_UNIX)
        continue;
      if (std::strncmp(peer.sun_path, path.c_str(), sizeof peer.sun_path) == 0)
        shutdown(static_cast<int>(fd), SHUT_RDWR);
    }
    closedir(fds);
  }

  std::string path_;
  std::mutex mutex_;
  std::condition_variable wake_;
  bool stop_ = false;
  bool armed_ = false;
  Clock::time_point deadline_;
  std::atomic<bool> fired_{false};
  std::thread thread_;
};

bool SocketFileExists(const std::string& path) {
  struct stat st;
  return lstat(path.c_str(), &st) == 0;
}

// The conversation, tried again while a starting server is not there yet or
// its queue is full; never longer than the bounds above.
CmdConnection* Connect(MyClient& client, const std::string& path, AnswerWatchdog& watchdog) {
  if (path.empty() || path.find('/') == std::string::npos || path.size() > kMaxSocketPath)
    return nullptr;
  const auto giveUp = Clock::now() + kConnectBudget;
  for (;;) {
    const bool socketThere = SocketFileExists(path);
    if (socketThere) {
      watchdog.Arm();
      wxConnectionBase* made = client.MakeConnection(kHost, wxString(path), kCommandTopic);
      watchdog.Disarm();
      if (made != nullptr) return static_cast<CmdConnection*>(made);
      // A server that took the connection but never answered is stuck:
      // asking again would only wait again.
      if (watchdog.Fired()) {
        Message("ERROR: DDE client ", "no answer from the server", 5);
        return nullptr;
      }
    }
    if (Clock::now() + kRetryPause > giveUp) return nullptr;
    std::this_thread::sleep_for(kRetryPause);
  }
}

}  // namespace

const void* CmdConnection::Request(const wxString& item, size_t* size, wxIPCFormat format) {
  const void* data = wxConnection::Request(item, size, format);
  Message("INFO: DDE client ", "Request...");
  return data;
}

bool CmdConnection::OnAdvise(const wxString&, const wxString&, const void*, size_t, wxIPCFormat) {
  Message("INFO: DDE client ", "OnAdvise...");
  return true;
}

bool CmdConnection::OnDisconnect() {
  Message("INFO: DDE client ", "OnDisconnect()");
  return true;
}

bool CmdConnection::DoExecute(const void* data, size_t size, wxIPCFormat format) {
  Message("INFO: DDE client ", "Execute...");
  const bool done = wxConnection::DoExecute(data, size, format);
  if (!done) Message("ERROR: DDE client ", "Execute failed!", 5);
  return done;
}

bool CmdConnection::DoPoke(const wxString& item, const void* data, size_t size,
                           wxIPCFormat format) {
  Message("INFO: DDE client ", "Poke...");
  return wxConnection::DoPoke(item, data, size, format);
}

MyClient::~MyClient() {
  if (m_commandConnection != nullptr) {
    m_commandConnection->Disconnect();
    delete m_commandConnection;
    m_commandConnection = nullptr;
    Message("INFO: DDE client ", "disconnected from server");
  }
}

wxConnectionBase* MyClient::OnMakeConnection() { return new CmdConnection; }

int SendCommand(const char* command, const std::string& socketPath) {
  const char* text = command != nullptr ? command : "";
  Message("INFO: SendCommand ", text);
  std::unique_ptr<MyClient> client(new MyClient);
  AnswerWatchdog watchdog(socketPath);

  const bool logging = wxLog::EnableLogging(false);
  Message("INFO: DDE client ", "is connecting...");
  client->m_commandConnection = Connect(*client, socketPath, watchdog);
  wxLog::EnableLogging(logging);

  const wxString status = wxString::Format(
      L"Client host=\"%s\" port=\"%s\" topic=\"%s\" %s", kHost, kCommandService, kCommandTopic,
      client->m_commandConnection != nullptr ? "connected" : "failed to connect");
  Message("INFO: Connection ", status.utf8_str().data());
  if (client->m_commandConnection == nullptr) return 0;

  // An execute is written at once; only a server whose queue is full could
  // hold it, and the watchdog bounds that too.
  watchdog.Arm();
  client->m_commandConnection->Execute(ToWx(text));
  client.reset();
  watchdog.Disarm();
  return 1;
}

int SendCommand(const char* command) { return SendCommand(command, CommandSocketPath()); }
