// Program entry and the application object: one running instance per user;
// a later start hands its command line to it and ends.
#include <wx/app.h>
#include <wx/config.h>
#include <wx/image.h>
#include <wx/log.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string>

#include "base/settings.h"
#include "base/trace.h"
#include "catalogue/documents.h"
#include "command/command.h"
#include "command/later_start.h"
#include "command/server_gui.h"
#include "platform/font_setup_gui.h"
#include "platform/instance_lock.h"
#include "platform/native_window_gui.h"
#include "platform/winapi.h"
#include "shell/app.h"
#include "shell/log.h"
#include "text/wxtext_gui.h"
#include "trovlib/prefetch.h"
#include "trovlib/trovlib.h"
#include "window/frame.h"
#include "window/panel.h"
#include "wordindex/locate.h"
#include "wordindex/wordlist.h"

namespace {

void Phase(const char* phase) { TraceMessage("Docuvane::OnInit --- ", phase); }

// The instance lock, taken in main before the toolkit starts: the running
// instance can then set work going that needs no toolkit while the toolkit
// loads.  OnInit takes it over.
std::unique_ptr<InstanceLock> g_earlyLock;

}  // namespace

class MyApp : public wxApp {
 public:
  ~MyApp() override = default;
  bool OnInit() override;
  int OnExit() override;
  wxAppTraits* CreateTraits() override { return new MyAppTraits; }

 private:
  std::unique_ptr<InstanceLock> m_checker;
  MyServer* m_server = nullptr;

  wxDECLARE_EVENT_TABLE();
};

// clang-format off
wxBEGIN_EVENT_TABLE(MyApp, wxApp)
wxEND_EVENT_TABLE()

wxIMPLEMENT_APP_NO_MAIN(MyApp);
// clang-format on

bool MyApp::OnInit() {
  if (g_earlyLock) {
    m_checker = std::move(g_earlyLock);
  } else {
    Phase("Start");
    m_checker = TakeInstanceLock();
  }

  if (m_checker->IsAnotherRunning()) ForwardAndEnd(argc, argv);

  wxInitAllImageHandlers();

  Phase("Names");
  SetVendorName("Lomari");
  SetAppName("Docuvane");

  Phase("pConfig");
  if (wxConfigBase::Get(false) == nullptr) wxConfigBase::Create();

  Phase("Command_Line");
  const std::string commandLine = Command_Line(argc, argv);

  Docuvane_Init(OpenInstalledWordIndex);
  // The word list and the INI file's documents are read while the window
  // is being built.
  Start_Fill_WordIndex();
  Start_Collect_Documents();

  Phase("Frame ...");
  MyFrame* frame = new MyFrame(ToWx(AppTitle));
  MainFrame = frame;
  SetTopWindow(frame);
  // Forwarded commands go to the frame's help panel while the frame lives.
  SetCommandRunner([frame](const std::string& command) {
    if (frame->IsIconized()) frame->Iconize(false);
    ProcessCommand(frame->m_helpPanel, command.c_str(), 1);
  });
  frame->Bind(wxEVT_DESTROY, [frame](wxWindowDestroyEvent& event) {
    if (event.GetEventObject() == frame) {
      MainFrame = nullptr;
      SetCommandRunner({});
    }
    event.Skip();
  });

  const NativeWindow window = NativeWindowOf(frame);
  TrovPublishWindow(kInstanceWindowName, window);
  char handle[16];
  std::snprintf(handle, sizeof handle, "%d",
                static_cast<int>(static_cast<std::uint32_t>(window & 0xFFFFFFFFul)));
  SetEnvironmentVariableA("LOMARISTERWINDOW", handle);

  // Only the lock holder may take the socket path over.
  if (m_checker->HoldsLock()) {
    m_server = StartCommandServer();
  } else {
    TrovMessage("WARNING: DDE server ", "no instance lock, command channel off", 4);
  }

  frame->Show(true);
  Phase("Parse_Command_Line");
  if (frame->IsIconized()) frame->Iconize(false);
  ProcessCommand(frame->m_helpPanel, commandLine.c_str(), 1);
  return true;
}

int MyApp::OnExit() {
  delete wxConfigBase::Set(nullptr);
  m_checker.reset();
  if (m_server != nullptr) {
    delete m_server;
    m_server = nullptr;
  }
  return 0;
}

int main(int argc, char** argv) {
  // Failed framework assertions are ignored, and its debug and trace
  // messages never reach the log target.
  wxSetAssertHandler(nullptr);
  wxLog::SetLogLevel(wxLOG_Info);
  Phase("Start");
  g_earlyLock = TakeInstanceLock();
  if (g_earlyLock->IsAnotherRunning()) ForwardArgumentsAndEnd(argc, argv);
  // The catalogue's first search walks the documentation tree, the panel's
  // first icon the icon trees, the first text the font configuration; as
  // the running instance, have them read while the toolkit starts.
  TrovPrefetchSearch(kDocumentationCategory);
  TrovPrefetchSearch("Icon");
  FontConfigurationPreload fonts;
  return wxEntry(argc, argv);
}
