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

// The server's end of a framework connection, whose operations go through
// this transport instead of the framework's own socket classes.
class ChannelConnection : public wxConnection {
 public:
  ChannelConnection() = default;
  ~ChannelConnection() override;

  // Ends the conversation from this end.
  bool Disconnect() override;

 protected:
  bool DoAdvise(const wxString& item, const void* data, size_t size, wxIPCFormat format) override;

 private:
  friend class ChannelServer;
  ChannelServer* server_ = nullptr;  // the transport serving it
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
