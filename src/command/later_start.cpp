#include "command/later_start.h"

#include <clocale>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <cwchar>
#include <string>
#include <vector>

#include "command/channel_names.h"
#include "command/command.h"
#include "command/forward.h"
#include "platform/files.h"
#include "platform/winapi.h"
#include "trovlib/trovlib.h"

namespace {

// How a later start ends: the framework's failure status (-1) when its
// command reached the running instance, otherwise one a script can tell.
constexpr unsigned kDeliveredStatus = 255;
constexpr unsigned kNotDeliveredStatus = 1;
constexpr unsigned kChannelOffStatus = 2;

}  // namespace

std::unique_ptr<InstanceLock> TakeInstanceLock(bool report) {
  char lockName[256];
  std::snprintf(lockName, sizeof lockName, "Lomari-Docuvane-%s", UserName().c_str());
  std::unique_ptr<InstanceLock> lock(new InstanceLock);
  lock->Create(lockName);
  if (report && !lock->error().empty())
    TrovMessage("ERROR: InstanceLock ", lock->error().c_str(), 5);
  return lock;
}

void ForwardAndEnd(int argc, const wchar_t* const* argv) {
  if (const NativeWindow window = TrovLookupWindow(kInstanceWindowName)) {
    if (IsIconic(window)) OpenIcon(window);
    BringWindowToTop(window);
    SetForegroundWindow(window);
  }
  const char* const command = Command_Line(argc, argv);
  unsigned status = kDeliveredStatus;
  const std::string socketPath = CommandSocketPath();
  if (socketPath.empty()) {
    // The running instance cannot serve a channel here either; a second
    // window would be a second instance.
    TrovMessage("ERROR: MyApp::OnInit ",
                (std::string("command channel off, command not delivered: ") + command).c_str(), 5);
    status = kChannelOffStatus;
  } else {
    bool delivered = false;
    ForwardCommand(command, socketPath, &delivered);
    if (!delivered) {
      TrovMessage(
          "ERROR: MyApp::OnInit ",
          (std::string("command not delivered to the running instance: ") + command).c_str(), 5);
      status = kNotDeliveredStatus;
    }
  }
  std::fflush(nullptr);
  ExitProcess(status);
}

void ForwardArgumentsAndEnd(int argc, char** argv) {
  std::setlocale(LC_ALL, "");
  std::vector<std::wstring> wide;
  for (int i = 0; i < argc; ++i) {
    std::mbstate_t state{};
    const char* from = argv[i];
    std::wstring arg(std::strlen(argv[i]) + 1, L'\0');
    const std::size_t n = std::mbsrtowcs(&arg[0], &from, arg.size(), &state);
    arg.resize(n == static_cast<std::size_t>(-1) ? 0 : n);
    wide.push_back(arg);
  }
  std::vector<const wchar_t*> wideArgv;
  for (const std::wstring& arg : wide) wideArgv.push_back(arg.c_str());
  wideArgv.push_back(nullptr);
  ForwardAndEnd(argc, wideArgv.data());
}
