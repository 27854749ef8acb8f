// The running instance's end of the command channel: a per-user Unix-domain
// socket served with the framework's IPC classes.  A later start of the
// program hands its command line over it (client_gui.h).
#pragma once

#include <sys/types.h>
#include <wx/ipc.h>

#include <functional>
#include <set>
#include <string>

class MyServer;

class MyConnection : public wxConnection {
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

  // Listens on `socketPath` (a path: the framework would listen on a TCP
  // port for a name without '/').  Removes what stands at the path first, so
  // only the holder of the instance lock may call it.
  bool Create(const wxString& socketPath) override;
  wxConnectionBase* OnAcceptConnection(const wxString& topic) override;

  MyConnection* m_acceptedConnection = nullptr;

  // Connection bookkeeping (MyConnection calls these).
  void Forget(MyConnection* connection);
  void Disconnected(MyConnection* connection);
  bool Owns(const void* connection) const;

 private:
  std::set<MyConnection*> connections_;
  class SocketTimeouts;
  SocketTimeouts* timeouts_ = nullptr;
  // The socket file this server made, so that it never removes another's.
  ino_t inode_ = 0;
  dev_t device_ = 0;
};

// The service name that messages carry.
extern const char* const kCommandService;  // "Lomari.DDE.Docuvane"
extern const char* const kCommandTopic;    // "CommandLine"

// "<runtime directory>/Lomari.DDE.Docuvane", or empty (with an "ERROR: "
// message) when the runtime directory is refused.
std::string CommandSocketPath();

// Longest socket path the kernel takes (sun_path less its NUL).  Longer
// paths would be cut by the framework into an abstract socket that every
// local user can reach, so they are refused.
constexpr std::size_t kMaxSocketPath = 107;

// Starts the server on CommandSocketPath(); NULL when it cannot.
MyServer* StartCommandServer();
// The same on a given path (tests).
MyServer* StartCommandServer(const std::string& socketPath);

// What the server does with a received command; by default ProcessCommand
// on the main frame's help panel.  Tests put their own here.
using CommandRunner = std::function<void(const std::string& command)>;
void SetCommandRunner(CommandRunner runner);

// Commands that arrived while a modal dialog or a nested event loop ran
// wait here until the main loop is idle again; at most this many.
constexpr std::size_t kMaxDeferredCommands = 64;
std::size_t DeferredCommandCount();
