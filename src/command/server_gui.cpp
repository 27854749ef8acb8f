// The command channel's server side: conversations, request items, and the
// commands, run at once or kept until the program is no longer busy.
#include "command/server_gui.h"

#include <wx/datetime.h>
#include <wx/evtloop.h>
#include <wx/timer.h>

#include <cstring>
#include <deque>

#include "base/busy.h"
#include "platform/modal_gui.h"
#include "platform/paths.h"
#include "platform/socket_posix.h"
#include "text/text.h"
#include "text/wxtext_gui.h"
#include "trovlib/trovlib.h"

namespace {

// The command line's own bound (its buffer holds 1023 bytes and the NUL).
constexpr std::size_t kMaxCommandBytes = 1023;

void Message(const char* prefix, const std::string& text, int level = 2) {
  TrovMessage(prefix, text.c_str(), level);
}

// ---------------------------------------------------------------------------
// Commands: run at once, or kept while the program is busy, so that a
// command never lands in the middle of another one, of a message box or of
// a download.

CommandRunner g_runner;
std::deque<std::string> g_deferred;
bool g_runningCommand = false;

bool ChannelBusy() {
  if (g_runningCommand || ProgramBusy() || ToolkitModalWindowShown()) return true;
  const wxEventLoopBase* loop = wxEventLoopBase::GetActive();
  return loop != nullptr && (!loop->IsMain() || loop->IsYielding());
}

void RunCommand(const std::string& command) {
  g_runningCommand = true;
  if (g_runner) {
    g_runner(command);
  } else {
    Message("WARNING: DDE server ", "no main window, command dropped: " + command, 4);
  }
  g_runningCommand = false;
}

// Runs the kept commands, one per tick, once the program is free again.
class DeferredCommands : public wxTimer {
 public:
  void Notify() override {
    if (ChannelBusy()) return;
    if (!g_deferred.empty()) {
      const std::string command = g_deferred.front();
      g_deferred.pop_front();
      RunCommand(command);
    }
    if (g_deferred.empty()) Stop();
  }
};

// False when the command cannot be kept.
bool RunOrDefer(const std::string& command) {
  if (!ChannelBusy() && g_deferred.empty()) {
    RunCommand(command);
    return true;
  }
  if (g_deferred.size() >= kMaxDeferredCommands) {
    Message("ERROR: DDE server ", "busy, command dropped: " + command, 5);
    return false;
  }
  g_deferred.push_back(command);
  Message("INFO: DDE server ", "busy, command deferred: " + command);
  static DeferredCommands* timer = new DeferredCommands;  // lives as long as the queue
  if (!timer->IsRunning()) timer->Start(50);
  return true;
}

}  // namespace

void SetCommandRunner(CommandRunner runner) { g_runner = std::move(runner); }

std::size_t DeferredCommandCount() { return g_deferred.size(); }

// ---------------------------------------------------------------------------

MyServer::MyServer() : channel_(new ChannelServer(this)) {}

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
  channel_->RemoveSocketFile();
}

bool MyServer::Create(const wxString& socketPath) {
  const std::string path = FromWx(socketPath);
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
  std::string error;
  if (!channel_->Listen(path, &error)) {
    Message("ERROR: DDE server ", error, 5);
    return false;
  }
  return true;
}

wxConnectionBase* MyServer::OnAcceptConnection(const wxString& topic) {
  Message("INFO: DDE server OnAcceptConnection ", FromWx(topic));
  if (topic != kCommandTopic) {
    Message("ERROR: DDE server ", "Unknown topic, connection refused", 5);
    return nullptr;
  }
  ForgetEnded();
  MyConnection* connection = new MyConnection(this);
  connections_.insert(connection);
  m_acceptedConnection = connection;
  Message("INFO: DDE server ", "Connection accepted");
  return connection;
}

void MyServer::Forget(MyConnection* connection) {
  if (connections_.erase(connection) == 0) return;
  if (connection == m_acceptedConnection) m_acceptedConnection = nullptr;
  delete connection;
}

// Ended conversations other than the one the server refers to are not
// needed any more; never while a command runs, which may have come from one
// of them and still be on its way out through it.
void MyServer::ForgetEnded() {
  if (g_runningCommand) return;
  for (auto it = connections_.begin(); it != connections_.end();) {
    MyConnection* c = *it++;
    if (c != m_acceptedConnection && c->Ended()) Forget(c);
  }
}

void MyServer::Disconnected(MyConnection*) { ForgetEnded(); }

// ---------------------------------------------------------------------------

MyConnection::MyConnection(MyServer* server) : server_(server) {}

MyConnection::~MyConnection() = default;

bool MyConnection::OnExec(const wxString&, const wxString& data) {
  const std::string command = CutUtf8(FromWx(data), kMaxCommandBytes);
  Message("INFO: DDE server Execute ", command);
  // Acknowledged whatever the command does; only one that cannot even be
  // kept is reported back as a failure.
  return RunOrDefer(command);
}

const void* MyConnection::OnRequest(const wxString&, const wxString& item, size_t* size,
                                    wxIPCFormat format) {
  *size = 0;
  wxString reply;
  wxString rest;
  if (item.StartsWith("Date", &rest)) {
    const wxDateTime now = wxDateTime::Now();
    if (rest.empty()) {
      reply = now.Format(wxDefaultDateTimeFormat);
      *size = wxNO_LEN;  // measured below: the text and its NUL
    } else if (rest == "+len") {
      reply = now.FormatTime() + " " + now.FormatDate();
      *size = wxNO_LEN;
    }
  } else if (item == "bytes[3]") {
    reply = "123";
    *size = 3;
  }
  if (*size == 0) {
    Message("ERROR: DDE server Unknown requestOnExecute ", FromWx(item));
    return nullptr;
  }
  // The dates are narrow text; a client asking for wide text would read
  // characters twice or four times their size.
  if (*size == wxNO_LEN && (format == wxIPC_UTF16TEXT || format == wxIPC_UTF32TEXT)) {
    *size = 0;
    Message("ERROR: DDE server ", "no reply in wide-text format " +
                                      std::to_string(static_cast<int>(format)) + " for " +
                                      FromWx(item));
    return nullptr;
  }
  const std::string bytes = FromWx(reply);
  m_replyBuffer = wxCharBuffer(bytes.size());
  std::memcpy(m_replyBuffer.data(), bytes.c_str(), bytes.size() + 1);
  // Every reply states its size: the terminating NUL is counted for text.
  if (*size == wxNO_LEN) *size = bytes.size() + 1;
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
  return ChannelConnection::DoAdvise(item, data, size, format);
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
  if (socketPath.empty() || !server->Create(ToWx(socketPath))) {
    Message("ERROR: DDE server failed to start ", kCommandService, 5);
    delete server;
    return nullptr;
  }
  Message("INFO: DDE server started ", kCommandService);
  Message("INFO: DDE server ", "uses DDE");
  return server;
}

MyServer* StartCommandServer() { return StartCommandServer(CommandSocketPath()); }
