// The command channel's client side.
#include "command/client_gui.h"

#include <wx/log.h>

#include <chrono>
#include <memory>
#include <thread>

#include "command/server_gui.h"
#include "platform/files.h"
#include "platform/socket_posix.h"
#include "text/wxtext_gui.h"
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

void Message(const char* prefix, const char* text, int level = 2) {
  TrovMessage(prefix, text, level);
}

// The conversation, tried again while a starting server is not there yet or
// its queue is full; never longer than the bound above.
CmdConnection* Connect(MyClient& client, const std::string& path) {
  if (path.empty() || path.find('/') == std::string::npos || path.size() > kMaxSocketPath)
    return nullptr;
  const auto giveUp = Clock::now() + kConnectBudget;
  for (;;) {
    if (PathExists(path)) {
      wxConnectionBase* made = client.MakeConnection(kHost, ToWx(path), kCommandTopic);
      if (made != nullptr) return static_cast<CmdConnection*>(made);
      // A server that took the connection but never answered is stuck:
      // asking again would only wait again.
      if (client.m_lastOpen == ChannelOpen::kNoAnswer) {
        Message("ERROR: DDE client ", "no answer from the server", 5);
        return nullptr;
      }
      if (client.m_lastOpen == ChannelOpen::kRefused) return nullptr;
    }
    if (Clock::now() + kRetryPause > giveUp) return nullptr;
    std::this_thread::sleep_for(kRetryPause);
  }
}

}  // namespace

const void* CmdConnection::Request(const wxString& item, size_t* size, wxIPCFormat format) {
  const void* data = ChannelConnection::Request(item, size, format);
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
  const bool done = ChannelConnection::DoExecute(data, size, format);
  if (!done) Message("ERROR: DDE client ", "Execute failed!", 5);
  return done;
}

bool CmdConnection::DoPoke(const wxString& item, const void* data, size_t size,
                           wxIPCFormat format) {
  Message("INFO: DDE client ", "Poke...");
  return ChannelConnection::DoPoke(item, data, size, format);
}

MyClient::~MyClient() {
  if (m_commandConnection != nullptr) {
    m_commandConnection->Disconnect();
    delete m_commandConnection;
    m_commandConnection = nullptr;
    Message("INFO: DDE client ", "disconnected from server");
  }
}

wxConnectionBase* MyClient::MakeConnection(const wxString&, const wxString& server,
                                           const wxString& topic) {
  std::unique_ptr<ChannelClient> channel(new ChannelClient);
  m_lastOpen = channel->Open(FromWx(server), FromWx(topic));
  if (m_lastOpen != ChannelOpen::kOpened) return nullptr;
  CmdConnection* connection = static_cast<CmdConnection*>(OnMakeConnection());
  ChannelClient::Attach(std::move(channel), connection);
  return connection;
}

wxConnectionBase* MyClient::OnMakeConnection() { return new CmdConnection; }

int SendCommand(const char* command, const std::string& socketPath, bool* delivered) {
  const char* text = command != nullptr ? command : "";
  if (delivered != nullptr) *delivered = false;
  Message("INFO: SendCommand ", text);
  std::unique_ptr<MyClient> client(new MyClient);

  const bool logging = wxLog::EnableLogging(false);
  Message("INFO: DDE client ", "is connecting...");
  client->m_commandConnection = Connect(*client, socketPath);
  wxLog::EnableLogging(logging);

  const wxString status = wxString::Format(
      L"Client host=\"%s\" port=\"%s\" topic=\"%s\" %s", kHost, kCommandService, kCommandTopic,
      client->m_commandConnection != nullptr ? "connected" : "failed to connect");
  Message("INFO: Connection ", status.utf8_str().data());
  if (client->m_commandConnection == nullptr) return 0;

  CmdConnection* connection = client->m_commandConnection;
  const bool sent = connection->Execute(ToWx(text));
  // The end of the conversation comes back once the server has taken the
  // execute: only then is the command delivered.
  connection->Disconnect();
  if (sent && !connection->Delivered())
    Message("ERROR: DDE client ", "the server did not take the command", 5);
  if (delivered != nullptr) *delivered = sent && connection->Delivered();
  client.reset();
  return 1;
}

int SendCommand(const char* command, bool* delivered) {
  return SendCommand(command, CommandSocketPath(), delivered);
}
