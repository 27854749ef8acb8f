// Program entry and the application object: one running instance per user;
// a later start hands its command line to it and ends.
#include <dlfcn.h>
#include <unistd.h>
#include <wx/app.h>
#include <wx/config.h>
#include <wx/image.h>
#include <wx/log.h>
#include <wx/utils.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string>

#include "command/client_gui.h"
#include "command/command.h"
#include "command/server_gui.h"
#include "platform/instance_lock.h"
#include "platform/window_activation.h"
#include "shell/app.h"
#include "shell/log.h"
#include "base/settings.h"
#include "base/trace.h"
#include "text/wxtext_gui.h"
#include "trovlib/trovlib.h"
#include "window/frame.h"
#include "window/panel.h"
#include "wordindex/locate.h"

namespace {

const char* const kWindowName = "Docuvane";

void Phase(const char* phase) { TraceMessage("Docuvane::OnInit --- ", phase); }

// The X11 id of a realised top-level window.  GTK is reached through the
// symbols the framework has already loaded, so that the program needs no
// GTK headers of its own; 0 when the window lives on another backend.
unsigned long NativeWindowId(wxWindow* window) {
  using Realize = void (*)(void*);
  using GetWindow = void* (*)(void*);
  using TypeName = const char* (*)(void*);
  using GetXid = unsigned long (*)(void*);
  static const auto realize = reinterpret_cast<Realize>(dlsym(RTLD_DEFAULT, "gtk_widget_realize"));
  static const auto getWindow =
      reinterpret_cast<GetWindow>(dlsym(RTLD_DEFAULT, "gtk_widget_get_window"));
  static const auto typeName =
      reinterpret_cast<TypeName>(dlsym(RTLD_DEFAULT, "g_type_name_from_instance"));
  static const auto getXid =
      reinterpret_cast<GetXid>(dlsym(RTLD_DEFAULT, "gdk_x11_window_get_xid"));
  void* widget = window != nullptr ? static_cast<void*>(window->GetHandle()) : nullptr;
  if (widget == nullptr || realize == nullptr || getWindow == nullptr || getXid == nullptr ||
      typeName == nullptr)
    return 0;
  realize(widget);
  void* gdkWindow = getWindow(widget);
  if (gdkWindow == nullptr) return 0;
  const char* type = typeName(gdkWindow);
  if (type == nullptr || std::string(type).find("X11") == std::string::npos) return 0;
  return getXid(gdkWindow);
}

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
// clang-format on

wxIMPLEMENT_APP_NO_MAIN(MyApp);

bool MyApp::OnInit() {
  Phase("Start");

  const std::string user = wxGetUserId().ToStdString();
  char lockName[256];
  std::snprintf(lockName, sizeof lockName, "Lomari-Docuvane-%s", user.c_str());
  m_checker.reset(new InstanceLock);
  m_checker->Create(lockName);

  if (m_checker->IsAnotherRunning()) {
    if (const unsigned long window = TrovLookupWindow(kWindowName)) {
      if (IsIconic(window)) OpenIcon(window);
      BringWindowToTop(window);
      SetForegroundWindow(window);
    }
    SendCommand(Command_Line(argc, argv));
    // Returning false makes the framework end the process with its failure
    // status (-1) after tearing the toolkit down, and that teardown loads
    // the toolkit's themes first: it costs a later start more than all it
    // has done so far.  The outcome is the same without it.
    std::fflush(nullptr);
    _exit(255);
  }

  wxInitAllImageHandlers();

  Phase("Names");
  SetVendorName("Lomari");
  SetAppName("Docuvane");

  Phase("pConfig");
  if (wxConfigBase::Get(false) == nullptr) wxConfigBase::Create();

  Phase("Command_Line");
  const std::string commandLine = Command_Line(argc, argv);

  Docuvane_Init(OpenInstalledWordIndex);

  Phase("Frame ...");
  MyFrame* frame = new MyFrame(ToWx(AppTitle));
  MainFrame = frame;
  SetTopWindow(frame);
  // The command channel reaches the frame through MainFrame: forget it
  // when the frame goes.
  frame->Bind(wxEVT_DESTROY, [frame](wxWindowDestroyEvent& event) {
    if (event.GetEventObject() == frame) MainFrame = nullptr;
    event.Skip();
  });

  const unsigned long window = NativeWindowId(frame);
  TrovPublishWindow(kWindowName, window);
  char handle[16];
  std::snprintf(handle, sizeof handle, "%d",
                static_cast<int>(static_cast<std::uint32_t>(window & 0xFFFFFFFFul)));
  setenv("LOMARISTERWINDOW", handle, 1);

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
  return wxEntry(argc, argv);
}
