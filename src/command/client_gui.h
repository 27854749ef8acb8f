// A later start's end of the command channel: hands the command line to the
// running instance and ends the conversation.
#pragma once

#include <wx/ipc.h>

#include <string>

#include "command/channel_gui.h"

class CmdConnection : public ChannelConnection {
 public:
  const void* Request(const wxString& item, size_t* size = nullptr,
                      wxIPCFormat format = wxIPC_TEXT) override;
  bool OnAdvise(const wxString& topic, const wxString& item, const void* data, size_t size,
                wxIPCFormat format) override;
  bool OnDisconnect() override;

 protected:
  bool DoExecute(const void* data, size_t size, wxIPCFormat format) override;
  bool DoPoke(const wxString& item, const void* data, size_t size, wxIPCFormat format) override;
};

class MyClient : public wxClient {
 public:
  MyClient() = default;
  ~MyClient() override;
  // `server` is the socket path.
  wxConnectionBase* MakeConnection(const wxString& host, const wxString& server,
                                   const wxString& topic) override;
  wxConnectionBase* OnMakeConnection() override;

  CmdConnection* m_commandConnection = nullptr;
  // How the last MakeConnection went.
  ChannelOpen m_lastOpen = ChannelOpen::kNoServer;
};

// Sends `command` to the running instance.  1 when a conversation was made
// (whatever the execute gave), 0 when no server answered.  `delivered`, when
// given, tells whether the instance took the command.
int SendCommand(const char* command, bool* delivered = nullptr);
// The same on a given socket path (tests, benchmarks).
int SendCommand(const char* command, const std::string& socketPath, bool* delivered = nullptr);
