// The desktop's side of document opening, on wxWidgets.
#include "access/desktop_services_gui.h"

#include <wx/msgdlg.h>
#include <wx/progdlg.h>
#include <wx/utils.h>
#include <wx/window.h>

#include "access/download.h"
#include "access/opendoc.h"
#include "access/opendoc_gui.h"
#include "base/busy.h"
#include "platform/findexec.h"
#include "platform/winapi.h"
#include "text/wxtext_gui.h"

namespace {

constexpr int kExpectedSize = 16777216;  // bytes that fill the progress range

int AskUser(const std::string& message, const std::string& caption, long style) {
  const BusyScope busy;
  const auto& hook = DesktopAccessServices::TestMessageBoxHook();
  if (hook) return hook(message, caption, style);
  return wxMessageBox(ToWx(message), ToWx(caption), style);
}

// The progress dialog as the transfer sees it.
class DialogProgress : public DownloadProgress {
 public:
  explicit DialogProgress(wxProgressDialog& dialog) : dialog_(dialog) {}

  bool Update(int value, const std::string& message) override {
    return dialog_.Update(value, message.empty() ? wxString() : ToWx(message));
  }
  void Resume() override { dialog_.Resume(); }
  bool AskAbortQuestion() override {
    return AskUser("Are you really want to abort downloading of the module ?",
                   "Lomari TeX Setup Abort Question",
                   wxYES_NO | wxNO_DEFAULT | wxICON_QUESTION) == wxYES;
  }

 private:
  wxProgressDialog& dialog_;
};

}  // namespace

DesktopAccessServices::MessageBoxHook& DesktopAccessServices::TestMessageBoxHook() {
  static MessageBoxHook hook;
  return hook;
}

DesktopAccessServices::DesktopAccessServices(wxWindow* parent) : parent_(parent) {}

long DesktopAccessServices::Execute(const std::vector<std::string>& argv) {
  // wxExecute reports a program that cannot be started only from the child,
  // after the start has been called a success; look first.
  if (argv.empty() || FindOnPath(argv[0]).empty()) return 0;
  // The vector form: every argument reaches the program as it is, with no
  // shell and no second splitting of the command line.
  std::vector<const char*> args;
  args.reserve(argv.size() + 1);
  for (const std::string& arg : argv) args.push_back(arg.c_str());
  args.push_back(nullptr);
  return wxExecute(args.data(), wxEXEC_ASYNC);
}

bool DesktopAccessServices::LaunchDefaultApplication(const std::string& path) {
  return wxLaunchDefaultApplication(ToWx(path), 0);
}

bool DesktopAccessServices::LaunchDefaultBrowser(const std::string& url) {
  return wxLaunchDefaultBrowser(ToWx(url), wxBROWSER_NEW_WINDOW);
}

std::string DesktopAccessServices::FindExecutable(const std::string& path) {
  char reader[260];
  if (FindExecutableA(path.c_str(), nullptr, reader) <= 32) return std::string();
  return reader;
}

int DesktopAccessServices::Download(const std::string& message, const std::string& url,
                                    const std::string& path) {
  const BusyScope busy;
  wxProgressDialog dialog("Lomari Docs", ToWx(message), 100, parent_,
                          wxPD_CAN_ABORT | wxPD_AUTO_HIDE | wxPD_ELAPSED_TIME |
                              wxPD_ESTIMATED_TIME | wxPD_REMAINING_TIME);
  DialogProgress progress(dialog);
  return wxGet(progress, 0, 100, url.c_str(), path.c_str(), kExpectedSize);
}

void DesktopAccessServices::ShowError(const std::string& message, const std::string& caption) {
  AskUser(message, caption, wxOK | wxICON_ERROR);
}

int OpenDocumentFile(wxWindow* parent, const char* fileName, const char* anchor) {
  DesktopAccessServices services(parent);
  return OpenDocumentFile(services, fileName, anchor);
}
