// The running instance's end of the command channel.  A later start of the
// program hands its command line over it (client_gui.h); the transport
// under the conversations is channel_gui.h.
#pragma once

#include <wx/ipc.h>

#include <functional>
#include <memory>
#include <set>
#include <string>

#include "command/channel_gui.h"
#include "command/channel_names.h"

class MyServer;

class MyConnection : public ChannelConnection {
 public:
  explicit MyConnection(MyServer* server);
  ~MyConnection() override;

  bool OnExec(const wxString& topic, const wxString& data) override;
  const void* OnRequest(const wxString& topic, const wxString& item, size_t* size,
                        wxIPCFormat format) override;
  bool OnPoke(const wxString& topic, const wxString& item, const void* data, size_t size,
              wxIPCFormat format) override;
  bool OnStartAdvise(const wxString& topic, const wxString& item) override;
  bool OnStopAdvise(const wxString& topic, const wxString& item) override;
  bool OnDisconnect() override;

  wxString m_adviseItem;
  // The reply of the last request; it must outlive OnRequest.
  wxCharBuffer m_replyBuffer;

  // True once the client has ended the conversation (or vanished).
  bool Ended() const { return ended_; }

 protected:
  bool DoAdvise(const wxString& item, const void* data, size_t size, wxIPCFormat format) override;

 private:
  MyServer* server_;
  bool ended_ = false;
};

class MyServer : public wxServer {
 public:
  MyServer();
  ~MyServer() override;

  // Listens on `socketPath` (a path: the framework would take a name
  // without '/' for a TCP port).  Removes what stands at the path first, so
  // only the holder of the instance lock may call it.
  bool Create(const wxString& socketPath) override;
  wxConnectionBase* OnAcceptConnection(const wxString& topic) override;

  MyConnection* m_acceptedConnection = nullptr;

  // Connection bookkeeping (MyConnection calls it).
  void Disconnected(MyConnection* connection);

 private:
  void Forget(MyConnection* connection);
  void ForgetEnded();

  std::set<MyConnection*> connections_;
  std::unique_ptr<ChannelServer> channel_;
};

// Starts the server on CommandSocketPath(); NULL when it cannot.
MyServer* StartCommandServer();
// The same on a given path (tests).
MyServer* StartCommandServer(const std::string& socketPath);

// What the server does with a received command.  Start-up hands in the
// main window's command processing; without a runner commands are dropped.
using CommandRunner = std::function<void(const std::string& command)>;
void SetCommandRunner(CommandRunner runner);

// Commands that arrive while the program is busy (a message box, a modal
// dialog, a download, another command) wait here until the main loop is
// idle again; at most this many.
constexpr std::size_t kMaxDeferredCommands = 64;
std::size_t DeferredCommandCount();
