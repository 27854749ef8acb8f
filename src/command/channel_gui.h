// The transport under the command channel's conversations.  The connection
// classes are the framework's; their bytes go over a per-user socket in the
// framework's own wire format, moved by this transport, which never waits
// on the GUI thread for a client and bounds every message (command/wire.h).
// The Unix transport is channel_unix_gui.cpp.
#pragma once

#include <wx/ipc.h>

#include <memory>
#include <string>

class ChannelServer;
class ChannelClient;

// A framework connection whose operations go through this transport
// instead of the framework's own socket classes.
class ChannelConnection : public wxConnection {
 public:
  ChannelConnection() = default;
  ~ChannelConnection() override;

  const void* Request(const wxString& item, size_t* size = nullptr,
                      wxIPCFormat format = wxIPC_TEXT) override;
  bool StartAdvise(const wxString& item) override;
  bool StopAdvise(const wxString& item) override;
  // Client side: ends the conversation and waits, within a bound, until
  // the server has taken everything sent before; see Delivered().
  bool Disconnect() override;
  // True when the server took every message of the conversation without a
  // failure and closed it after the end message.
  bool Delivered() const { return delivered_; }

 protected:
  bool DoExecute(const void* data, size_t size, wxIPCFormat format) override;
  bool DoPoke(const wxString& item, const void* data, size_t size, wxIPCFormat format) override;
  bool DoAdvise(const wxString& item, const void* data, size_t size, wxIPCFormat format) override;

 private:
  friend class ChannelServer;
  friend class ChannelClient;
  ChannelServer* server_ = nullptr;        // server side: the transport serving it
  std::unique_ptr<ChannelClient> client_;  // client side: its own socket
  std::string reply_;                      // the last request's reply
  bool delivered_ = false;
};

// The server's end: a listening socket whose conversations are read as
// their bytes arrive, inside whatever event loop runs (a modal dialog's, a
// progress dialog's yield, the toolkit's own for a message box).
class ChannelServer {
 public:
  // `server` is asked to accept each conversation (OnAcceptConnection);
  // the connections it returns must be ChannelConnections.
  explicit ChannelServer(wxServerBase* server);
  ~ChannelServer();
  ChannelServer(const ChannelServer&) = delete;
  ChannelServer& operator=(const ChannelServer&) = delete;

  // Listens at `path`, replacing what stands there.
  bool Listen(const std::string& path, std::string* error);
  // Removes the socket file unless another instance has put its own there.
  void RemoveSocketFile();

  struct Impl;

 private:
  friend class ChannelConnection;
  static void Serve(ChannelConnection* connection, ChannelServer* server) {
    connection->server_ = server;
  }
  bool Advise(ChannelConnection* connection, const std::string& message);
  void Forget(ChannelConnection* connection);
  std::unique_ptr<Impl> impl_;
};

// How opening a conversation went.
enum class ChannelOpen {
  kOpened,
  kNoServer,  // nothing takes connections at the path (yet): worth another try
  kRefused,   // the server refused the topic
  kNoAnswer,  // the server took the connection but did not answer in time
};

// The client's end of one conversation.
class ChannelClient {
 public:
  ~ChannelClient();
  ChannelOpen Open(const std::string& path, const std::string& topic);
  // Gives `connection` this conversation.
  static void Attach(std::unique_ptr<ChannelClient> client, ChannelConnection* connection);

 private:
  friend class ChannelConnection;
  bool Send(const std::string& message);
  // The server's answer to the last message: its code, -1 when none came.
  int Answer(std::string* data);
  bool Finish();
  int fd_ = -1;
};

// Longest wait of a later start for any one answer of the server.  It
// answers at once when idle; dozens of starts at once on a busy machine
// queue up behind each other for a few seconds; longer means it is stuck.
constexpr int kChannelAnswerMs = 5000;
