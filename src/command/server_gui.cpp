// The command channel's server side.
#include "command/server_gui.h"

#include <dlfcn.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>
#include <wx/app.h>
#include <wx/datetime.h>
#include <wx/eventfilter.h>
#include <wx/evtloop.h>
#include <wx/socket.h>

#include <atomic>
#include <cerrno>
#include <chrono>
#include <cstdint>
#include <cstring>
#include <deque>
#include <thread>

#include "platform/paths.h"
#include "shell/app.h"
#include "text/wxtext_gui.h"
#include "trovlib/trovlib.h"
#include "window/frame.h"
#include "window/panel.h"

const char* const kCommandService = "Lomari.DDE.Docuvane";
const char* const kCommandTopic = "CommandLine";

namespace {

// How long a connected client may take to send its opening message, and
// the framework's wait for any later read on a conversation: a silent or
// stalled client must not hold the window longer than this.
constexpr int kHandshakeMilliseconds = 1500;
constexpr long kConversationTimeoutSeconds = 2;
// Longest topic a client may name (ours is "CommandLine").
constexpr std::uint32_t kMaxTopicBytes = 256;
// The framework's message code that opens a conversation.
constexpr unsigned char kConnectMessage = 10;

std::atomic<int> g_listenFd{-1};

void Message(const char* prefix, const std::string& text, int level = 2) {
  TrovMessage(prefix, text.c_str(), level);
}

// True when the peer of an accepted socket runs under our own uid.
bool PeerIsThisUser(int fd, uid_t* peerUid) {
  ucred credentials{};
  socklen_t length = sizeof credentials;
  if (getsockopt(fd, SOL_SOCKET, SO_PEERCRED, &credentials, &length) != 0) return false;
  *peerUid = credentials.uid;
  return credentials.uid == geteuid();
}

// Waits, within kHandshakeMilliseconds, until the client's opening message
// (code, 32-bit little-endian length, topic) has fully arrived, without
// consuming it.  The framework then reads it without waiting.
bool OpeningMessageArrives(int fd) {
  const auto deadline =
      std::chrono::steady_clock::now() + std::chrono::milliseconds(kHandshakeMilliseconds);
  unsigned char buffer[5 + kMaxTopicBytes];
  for (;;) {
    const ssize_t got = recv(fd, buffer, sizeof buffer, MSG_PEEK | MSG_DONTWAIT);
    if (got == 0) return false;  // the client went away
    if (got > 0) {
      if (buffer[0] != kConnectMessage) return true;  // the framework refuses it
      if (got >= 5) {
        const std::uint32_t length = buffer[1] | (buffer[2] << 8) | (buffer[3] << 16) |
                                     (static_cast<std::uint32_t>(buffer[4]) << 24);
        if (length > kMaxTopicBytes) return false;
        if (static_cast<std::size_t>(got) >= 5 + length) return true;
      }
    } else if (errno != EAGAIN && errno != EWOULDBLOCK && errno != EINTR) {
      return false;
    }
    const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(
        deadline - std::chrono::steady_clock::now());
    if (left.count() <= 0) return false;
    if (got > 0) {
      // Part of the message is there: poll would not wait for the rest.
      std::this_thread::sleep_for(std::chrono::milliseconds(2));
    } else {
      pollfd p{fd, POLLIN, 0};
      poll(&p, 1, static_cast<int>(left.count()));
    }
  }
}

// Decides on a connection just accepted on the command socket; false drops it.
bool AdmitConnection(int fd) {
  uid_t uid = 0;
  if (!PeerIsThisUser(fd, &uid)) {
    Message("ERROR: DDE server ",
            "connection of another user (uid " + std::to_string(uid) + ") refused", 5);
    return false;
  }
  if (!OpeningMessageArrives(fd)) {
    Message("WARNING: DDE server ",
            "client sent no request within " + std::to_string(kHandshakeMilliseconds) +
                " ms, connection closed",
            4);
    return false;
  }
  return true;
}

}  // namespace

// The framework accepts connections and reads the client's first message in
// one go, leaving no place to look at the peer in between.  Its accept()
// call on the command socket therefore comes here first: connections of
// other users and silent clients are closed before the framework reads a
// byte of them; everything else passes through unchanged.
extern "C" int accept(int fd, sockaddr* address, socklen_t* length) {
  using AcceptFunction = int (*)(int, sockaddr*, socklen_t*);
  static const AcceptFunction real = reinterpret_cast<AcceptFunction>(dlsym(RTLD_NEXT, "accept"));
  if (real == nullptr) {
    errno = ENOSYS;
    return -1;
  }
  for (;;) {
    const int connection = real(fd, address, length);
    if (connection < 0 || fd != g_listenFd.load()) return connection;
    if (AdmitConnection(connection)) return connection;
    close(connection);
    // Look for another waiting client without blocking the caller.
    pollfd p{fd, POLLIN, 0};
    if (poll(&p, 1, 0) <= 0) {
      errno = EAGAIN;
      return -1;
    }
  }
}

// ---------------------------------------------------------------------------
// Commands: run at once, or kept while a modal dialog or a nested event loop
// runs, so that a command never lands in the middle of another one.

namespace {

CommandRunner g_runner;
std::deque<std::string> g_deferred;
bool g_runningCommand = false;

void RunOnMainFrame(const std::string& command) {
  if (MainFrame == nullptr) {
    Message("WARNING: DDE server ", "no main window, command dropped: " + command, 4);
    return;
  }
  if (MainFrame->IsIconized()) MainFrame->Iconize(false);
  ProcessCommand(MainFrame->m_helpPanel, command.c_str(), 1);
}

bool ChannelBusy() {
  if (g_runningCommand) return true;
  const wxEventLoopBase* loop = wxEventLoopBase::GetActive();
  return loop != nullptr && (!loop->IsMain() || loop->IsYielding());
}

void RunCommand(const std::string& command) {
  g_runningCommand = true;
  if (g_runner) {
    g_runner(command);
  } else {
    RunOnMainFrame(command);
  }
  g_runningCommand = false;
}

void RunOrDefer(const std::string& command) {
  if (!ChannelBusy() && g_deferred.empty()) {
    RunCommand(command);
    return;
  }
  if (g_deferred.size() >= kMaxDeferredCommands) {
    Message("ERROR: DDE server ", "busy, command dropped: " + command, 5);
    return;
  }
  g_deferred.push_back(command);
  Message("INFO: DDE server ", "busy, command deferred: " + command);
}

void RunDeferredWhenIdle(wxIdleEvent& event) {
  event.Skip();
  if (g_deferred.empty() || ChannelBusy()) return;
  const std::string command = g_deferred.front();
  g_deferred.pop_front();
  RunCommand(command);
  if (!g_deferred.empty()) event.RequestMore();
}

}  // namespace

void SetCommandRunner(CommandRunner runner) { g_runner = std::move(runner); }

std::size_t DeferredCommandCount() { return g_deferred.size(); }

// ---------------------------------------------------------------------------

// Shortens the framework's read time-out (ten minutes) on every socket of a
// conversation before its first message is read.
class MyServer::SocketTimeouts : public wxEventFilter {
 public:
  explicit SocketTimeouts(MyServer* server) : server_(server) { wxEvtHandler::AddFilter(this); }
  ~SocketTimeouts() override { wxEvtHandler::RemoveFilter(this); }

  int FilterEvent(wxEvent& event) override {
    if (event.GetEventType() != wxEVT_SOCKET) return Event_Skip;
    wxSocketEvent& socketEvent = static_cast<wxSocketEvent&>(event);
    if (!server_->Owns(socketEvent.GetClientData())) return Event_Skip;
    wxSocketBase* socket = socketEvent.GetSocket();
    if (socket != nullptr && socket->GetTimeout() > kConversationTimeoutSeconds)
      socket->SetTimeout(kConversationTimeoutSeconds);
    return Event_Skip;
  }

 private:
  MyServer* server_;
};

std::string CommandSocketPath() {
  std::string error;
  const std::string dir = RuntimeDirectory(&error);
  if (dir.empty()) {
    TrovMessage("ERROR: RuntimeDirectory ", error.c_str(), 5);
    return std::string();
  }
  return dir + "/" + kCommandService;
}

MyServer::MyServer() : timeouts_(new SocketTimeouts(this)) {}

MyServer::~MyServer() {
  if (m_acceptedConnection != nullptr) {
    MyConnection* last = m_acceptedConnection;
    connections_.erase(last);
    m_acceptedConnection = nullptr;
    delete last;
    Message("INFO: DDE server ", "Disconnected client");
  }
  // Earlier conversations still open at exit.
  while (!connections_.empty()) {
    MyConnection* connection = *connections_.begin();
    connections_.erase(connections_.begin());
    delete connection;
  }
  delete timeouts_;
  if (m_server != nullptr && g_listenFd.load() == static_cast<int>(m_server->GetSocket()))
    g_listenFd.store(-1);
  // The framework removes the socket file as it goes; if a later instance
  // has put its own socket there meanwhile, that one stays.
  if (!m_filename.empty()) {
    struct stat now;
    if (lstat(m_filename.fn_str(), &now) != 0 || now.st_ino != inode_ || now.st_dev != device_)
      m_filename.clear();
  }
}

bool MyServer::Create(const wxString& socketPath) {
  const std::string path = socketPath.ToStdString();
  if (path.find('/') == std::string::npos) {
    Message("ERROR: DDE server ", "not a socket path: " + path, 5);
    return false;
  }
  if (path.size() > kMaxSocketPath) {
    Message("ERROR: DDE server ",
            "socket path of " + std::to_string(path.size()) + " bytes is too long (at most " +
                std::to_string(kMaxSocketPath) + "): " + path,
            5);
    return false;
  }
  if (!wxServer::Create(socketPath)) return false;
  chmod(path.c_str(), 0600);
  struct stat st;
  if (lstat(path.c_str(), &st) == 0) {
    inode_ = st.st_ino;
    device_ = st.st_dev;
  }
  g_listenFd.store(static_cast<int>(m_server->GetSocket()));
  return true;
}

wxConnectionBase* MyServer::OnAcceptConnection(const wxString& topic) {
  Message("INFO: DDE server OnAcceptConnection ", FromWx(topic));
  if (topic != kCommandTopic) {
    Message("ERROR: DDE server ", "Unknown topic, connection refused", 5);
    return nullptr;
  }
  MyConnection* connection = new MyConnection(this);
  connections_.insert(connection);
  MyConnection* previous = m_acceptedConnection;
  m_acceptedConnection = connection;
  Message("INFO: DDE server ", "Connection accepted");
  // An earlier conversation that has already ended is not needed any more.
  if (previous != nullptr && previous->Ended()) Forget(previous);
  return connection;
}

void MyServer::Forget(MyConnection* connection) {
  if (connections_.erase(connection) == 0) return;
  if (connection == m_acceptedConnection) m_acceptedConnection = nullptr;
  delete connection;
}

void MyServer::Disconnected(MyConnection* connection) {
  // The conversation the server refers to stays until exit; earlier ones go.
  if (connection != m_acceptedConnection) Forget(connection);
}

bool MyServer::Owns(const void* connection) const {
  return connection != nullptr &&
         connections_.count(static_cast<MyConnection*>(const_cast<void*>(connection))) != 0;
}

// ---------------------------------------------------------------------------

MyConnection::MyConnection(MyServer* server) : server_(server) {}

MyConnection::~MyConnection() = default;

bool MyConnection::OnExec(const wxString&, const wxString& data) {
  const std::string command = FromWx(data);
  Message("INFO: DDE server Execute ", command);
  RunOrDefer(command);
  return true;
}

const void* MyConnection::OnRequest(const wxString&, const wxString& item, size_t* size,
                                    wxIPCFormat) {
  *size = 0;
  wxString reply;
  wxString rest;
  if (item.StartsWith("Date", &rest)) {
    const wxDateTime now = wxDateTime::Now();
    if (rest.empty()) {
      reply = now.Format(wxDefaultDateTimeFormat);
      *size = wxNO_LEN;
    } else if (rest == "+len") {
      reply = now.FormatTime() + " " + now.FormatDate();
      *size = 1;  // set from the 8-bit text below
    }
  } else if (item == "bytes[3]") {
    reply = "123";
    *size = 3;
  }
  if (*size == 0) {
    Message("ERROR: DDE server Unknown requestOnExecute ", FromWx(item));
    return nullptr;
  }
  const std::string bytes = FromWx(reply);
  m_replyBuffer = wxCharBuffer(bytes.size());
  std::memcpy(m_replyBuffer.data(), bytes.c_str(), bytes.size() + 1);
  if (*size == 1) *size = bytes.size() + 1;  // the terminating NUL is counted
  Message("INFO: DDE server ", "OnRequest...");
  return m_replyBuffer.data();
}

bool MyConnection::OnPoke(const wxString&, const wxString&, const void*, size_t, wxIPCFormat) {
  Message("INFO: DDE server ", "OnPoke...");
  return false;
}

bool MyConnection::OnStartAdvise(const wxString&, const wxString& item) {
  Message("INFO: DDE server OnStartAdvise ", FromWx(item));
  m_adviseItem = item;
  return true;
}

bool MyConnection::OnStopAdvise(const wxString&, const wxString& item) {
  Message("INFO: DDE server OnStopAdvise ", FromWx(item));
  m_adviseItem.clear();
  return true;
}

bool MyConnection::DoAdvise(const wxString& item, const void* data, size_t size,
                            wxIPCFormat format) {
  Message("INFO: DDE server Advice ", FromWx(item));
  return wxConnection::DoAdvise(item, data, size, format);
}

bool MyConnection::OnDisconnect() {
  Message("INFO: DDE server ", "OnDisconnect()");
  ended_ = true;
  // May delete this object: nothing may touch it afterwards.
  server_->Disconnected(this);
  return true;
}

// ---------------------------------------------------------------------------

MyServer* StartCommandServer(const std::string& socketPath) {
  MyServer* server = new MyServer;
  if (socketPath.empty() || !server->Create(wxString(socketPath))) {
    Message("ERROR: DDE server failed to start ", kCommandService, 5);
    delete server;
    return nullptr;
  }
  Message("INFO: DDE server started ", kCommandService);
  Message("INFO: DDE server ", "uses DDE");
  static bool idleBound = false;
  if (!idleBound && wxTheApp != nullptr) {
    wxTheApp->Bind(wxEVT_IDLE, &RunDeferredWhenIdle);
    idleBound = true;
  }
  return server;
}

MyServer* StartCommandServer() { return StartCommandServer(CommandSocketPath()); }
