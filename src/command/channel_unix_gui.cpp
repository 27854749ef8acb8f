// The command channel's transport on Unix: a Unix-domain socket in the
// per-user runtime directory, watched by the event loop, read without
// waiting.  Each conversation keeps what has arrived until a whole message
// is there; one that claims too much, stops in the middle or stays silent
// is dropped on its own, and nothing of it is run.
#include <wx/app.h>
#include <wx/evtloop.h>
#include <wx/evtloopsrc.h>
#include <wx/timer.h>

#include <chrono>
#include <cstring>
#include <map>
#include <memory>
#include <vector>

#include "command/channel_gui.h"
#include "command/wire.h"
#include "platform/files.h"
#include "platform/socket_posix.h"
#include "trovlib/trovlib.h"

namespace {

using Clock = std::chrono::steady_clock;
using std::chrono::milliseconds;

// How long a client may take for its opening after connecting, and for the
// rest of any message once its first byte has come.
constexpr milliseconds kMessageLimit(2000);
// Bytes read for one conversation per wake-up, so that a flood on one
// socket cannot hold the loop.
constexpr std::size_t kReadPerWakeUp = 64 * 1024;

void Message(const char* prefix, const std::string& text, int level = 2) {
  TrovMessage(prefix, text.c_str(), level);
}

std::string Code(unsigned char code) { return std::string(1, static_cast<char>(code)); }

}  // namespace

// ---------------------------------------------------------------------------
// Server

struct Conversation : public wxEventLoopSourceHandler {
  ChannelServer::Impl* owner = nullptr;
  int fd = -1;
  wxEventLoopSource* source = nullptr;
  std::string arrived;
  ChannelConnection* connection = nullptr;  // once the topic is accepted
  wxString topic;
  Clock::time_point deadline;
  bool waiting = false;  // the deadline counts
  bool dead = false;

  void OnReadWaiting() override;
  void OnWriteWaiting() override {}
  void OnExceptionWaiting() override { OnReadWaiting(); }
};

struct ChannelServer::Impl : public wxEventLoopSourceHandler {
  class Ticker : public wxTimer {
   public:
    explicit Ticker(Impl* owner) : owner_(owner) {}
    void Notify() override { owner_->Tick(); }

   private:
    Impl* owner_;
  };

  wxServerBase* server = nullptr;
  std::string path;
  SocketFileId made;
  int listener = -1;
  wxEventLoopSource* listenSource = nullptr;
  std::vector<std::unique_ptr<Conversation>> open;
  // Conversations ended inside their own callback wait here until the
  // loop has left it.
  std::vector<std::unique_ptr<Conversation>> ended;
  Ticker ticker{this};
  int serving = 0;  // conversations being read, further up the stack

  ~Impl() override {
    ticker.Stop();
    while (!open.empty()) End(open.back().get(), false);
    delete listenSource;
    CloseSocket(listener);
  }

  void OnReadWaiting() override { AcceptWaitingClients(); }
  void OnWriteWaiting() override {}
  void OnExceptionWaiting() override {}

  void AcceptWaitingClients() {
    for (int i = 0; i < 64; ++i) {
      const int fd = AcceptWaiting(listener);
      if (fd < 0) return;
      unsigned uid = 0;
      if (!PeerUserId(fd, &uid) || uid != CurrentUserId()) {
        Message("ERROR: DDE server ",
                "connection of another user (uid " + std::to_string(uid) + ") refused", 5);
        CloseSocket(fd);
        continue;
      }
      auto c = std::make_unique<Conversation>();
      c->owner = this;
      c->fd = fd;
      c->source = wxEventLoopBase::AddSourceForFD(fd, c.get(),
                                                  wxEVENT_SOURCE_INPUT | wxEVENT_SOURCE_EXCEPTION);
      if (c->source == nullptr) {
        Message("ERROR: DDE server ", "cannot watch a connection", 5);
        CloseSocket(fd);
        continue;
      }
      Wait(c.get());
      open.push_back(std::move(c));
    }
  }

  void Wait(Conversation* c) {
    c->deadline = Clock::now() + kMessageLimit;
    c->waiting = true;
    if (!ticker.IsRunning()) ticker.Start(100);
  }

  void Service(Conversation* c) {
    ++serving;
    Read(c);
    --serving;
  }

  void Read(Conversation* c) {
    char buffer[4096];
    for (std::size_t taken = 0; !c->dead && taken < kReadPerWakeUp;) {
      const long got = ReadArrived(c->fd, buffer, sizeof buffer);
      if (got == -1) return;  // all read
      if (got <= 0) {
        if (!c->arrived.empty()) {
          Drop(c, "the client went away after " + std::to_string(c->arrived.size()) +
                      " bytes of a message");
        } else {
          End(c, true);
        }
        return;
      }
      taken += static_cast<std::size_t>(got);
      if (c->arrived.empty()) Wait(c);  // a message begins: it has its time to complete
      c->arrived.append(buffer, static_cast<std::size_t>(got));
      TakeMessages(c);
    }
  }

  void TakeMessages(Conversation* c) {
    while (!c->dead && !c->arrived.empty()) {
      std::size_t used = 0;
      wire::Message m;
      std::string error;
      const wire::Parse parse = wire::TakeMessage(c->arrived, false, &used, &m, &error);
      if (parse == wire::Parse::kIncomplete) return;
      if (parse == wire::Parse::kBad) {
        Drop(c, error);
        return;
      }
      c->arrived.erase(0, used);
      if (c->arrived.empty() && c->connection != nullptr) c->waiting = false;
      if (c->connection == nullptr) {
        Open(c, m);
      } else {
        Handle(c, m);
      }
    }
  }

  void Open(Conversation* c, const wire::Message& m) {
    if (m.code != wire::kConnect) {
      Drop(c, "a conversation must begin with its topic");
      return;
    }
    c->topic = wxString::FromUTF8(m.name.data(), m.name.size());
    wxConnectionBase* accepted = server->OnAcceptConnection(c->topic);
    ChannelConnection* connection = dynamic_cast<ChannelConnection*>(accepted);
    if (connection == nullptr) {
      delete accepted;
      Reply(c, Code(wire::kFail));
      End(c, false);
      return;
    }
    ChannelServer::Serve(connection, owner);
    c->connection = connection;
    c->waiting = !c->arrived.empty();
    Reply(c, Code(wire::kConnect));
  }

  void Handle(Conversation* c, const wire::Message& m) {
    ChannelConnection* connection = c->connection;
    const wxIPCFormat format = static_cast<wxIPCFormat>(m.format);
    const wxString item = wxString::FromUTF8(m.name.data(), m.name.size());
    switch (m.code) {
      case wire::kExecute:
        if (!wxConnectionBase::IsTextFormat(format)) {
          Drop(c, "an execute in format " + std::to_string(m.format) + " is not text");
          break;
        }
        Rewatch(c);
        if (!connection->OnExecute(c->topic, m.data.data(), m.data.size(), format)) {
          Reply(c, Code(wire::kFail));
        }
        break;
      case wire::kRequest: {
        size_t size = wxNO_LEN;
        const void* data = connection->OnRequest(c->topic, item, &size, format);
        // A reply states its own size: the transport cannot know how far
        // the handler's buffer goes.
        if (data == nullptr || size == wxNO_LEN || size > wire::kMaxDataBytes) {
          Reply(c, Code(wire::kFail));
        } else {
          Reply(c, Code(wire::kRequestReply) + wire::Data(data, size));
        }
        break;
      }
      case wire::kPoke:
        connection->OnPoke(c->topic, item, m.data.data(), m.data.size(), format);
        break;
      case wire::kAdviseStart:
        Reply(c,
              Code(connection->OnStartAdvise(c->topic, item) ? wire::kAdviseStart : wire::kFail));
        break;
      case wire::kAdviseStop:
        Reply(c, Code(connection->OnStopAdvise(c->topic, item) ? wire::kAdviseStop : wire::kFail));
        break;
      case wire::kDisconnect:
        End(c, true);
        break;
      case wire::kFail:
        break;  // answering a failure with one would never end
      default:
        Reply(c, Code(wire::kFail));
        break;
    }
  }

  // The loop holds a watch back while its callback runs.  A command may
  // open a dialog or run a download with a loop of its own: a fresh watch
  // lets that loop go on reading this conversation (its end, above all).
  void Rewatch(Conversation* c) {
    delete c->source;
    c->source =
        wxEventLoopBase::AddSourceForFD(c->fd, c, wxEVENT_SOURCE_INPUT | wxEVENT_SOURCE_EXCEPTION);
  }

  // Answers are a few bytes: a client that does not take them at once is
  // not reading.
  void Reply(Conversation* c, const std::string& bytes) {
    if (!c->dead && !WriteAll(c->fd, bytes, 100)) Drop(c, "the client does not read its answers");
  }

  void Drop(Conversation* c, const std::string& reason) {
    Message("ERROR: DDE server ", "connection closed: " + reason, 5);
    WriteAll(c->fd, Code(wire::kFail), 0);
    End(c, true);
  }

  // Ends a conversation; with `tell`, its connection hears of it
  // (OnDisconnect, which may delete the connection).
  void End(Conversation* c, bool tell) {
    if (c->dead) return;
    c->dead = true;
    delete c->source;
    c->source = nullptr;
    CloseSocket(c->fd);
    c->fd = -1;
    ChannelConnection* connection = c->connection;
    c->connection = nullptr;
    if (connection != nullptr) ChannelServer::Serve(connection, nullptr);
    for (auto it = open.begin(); it != open.end(); ++it)
      if (it->get() == c) {
        ended.push_back(std::move(*it));
        open.erase(it);
        break;
      }
    if (!ticker.IsRunning()) ticker.Start(100);
    if (connection != nullptr && tell) connection->OnDisconnect();
  }

  void Tick() {
    if (serving == 0) ended.clear();
    const auto now = Clock::now();
    std::vector<Conversation*> late;
    for (const auto& c : open)
      if (c->waiting && now >= c->deadline) late.push_back(c.get());
    for (Conversation* c : late)
      Drop(c, "no complete message within " + std::to_string(kMessageLimit.count()) + " ms");
    bool waiting = false;
    for (const auto& c : open) waiting = waiting || c->waiting;
    if (!waiting && ended.empty()) ticker.Stop();
  }

  Conversation* Find(ChannelConnection* connection) {
    for (const auto& c : open)
      if (c->connection == connection) return c.get();
    return nullptr;
  }

  ChannelServer* owner = nullptr;
};

void Conversation::OnReadWaiting() {
  if (!dead) owner->Service(this);
}

ChannelServer::ChannelServer(wxServerBase* server) : impl_(new Impl) {
  impl_->server = server;
  impl_->owner = this;
}

ChannelServer::~ChannelServer() = default;

bool ChannelServer::Listen(const std::string& path, std::string* error) {
  const int fd = ListenAt(path, error);
  if (fd < 0) return false;
  impl_->listenSource = wxEventLoopBase::AddSourceForFD(fd, impl_.get(), wxEVENT_SOURCE_INPUT);
  if (impl_->listenSource == nullptr) {
    *error = "the event loop cannot watch the socket";
    CloseSocket(fd);
    return false;
  }
  impl_->listener = fd;
  impl_->path = path;
  SocketFileIdOf(path, &impl_->made);
  return true;
}

void ChannelServer::RemoveSocketFile() {
  SocketFileId now;
  if (!impl_->path.empty() && SocketFileIdOf(impl_->path, &now) && now == impl_->made)
    RemoveFile(impl_->path);
  impl_->path.clear();
}

bool ChannelServer::Advise(ChannelConnection* connection, const std::string& message) {
  Conversation* c = impl_->Find(connection);
  if (c == nullptr) return false;
  impl_->Reply(c, message);
  return !c->dead;
}

void ChannelServer::Forget(ChannelConnection* connection) {
  if (Conversation* c = impl_->Find(connection)) impl_->End(c, false);
}

// ---------------------------------------------------------------------------
// Connection operations over the transport

ChannelConnection::~ChannelConnection() {
  if (server_ != nullptr) server_->Forget(this);
  // The framework's destructor would otherwise talk on a socket of its own
  // that this connection never had.
  SetConnected(false);
}

// A connection here is always the server's end: a later start talks to the
// server without the toolkit (command/forward.cpp).  Only advice and the
// end of a conversation go from this end.
bool ChannelConnection::Disconnect() {
  if (!GetConnected()) return true;
  SetConnected(false);
  if (server_ != nullptr) {
    server_->Advise(this, Code(wire::kDisconnect));
    server_->Forget(this);
  }
  return true;
}

bool ChannelConnection::DoAdvise(const wxString& item, const void* data, size_t size,
                                 wxIPCFormat format) {
  const wxScopedCharBuffer name = item.utf8_str();
  return server_ != nullptr && size <= wire::kMaxDataBytes &&
         server_->Advise(this, Code(wire::kAdvise) + wire::Name(name.data()) + Code(format) +
                                   wire::Data(data, size));
}
