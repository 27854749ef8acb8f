// The desktop behind document opening: wxWidgets' process start, default
// application and browser, the file-type association, the progress dialog
// of a download and the user's message boxes.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "access/services.h"

class wxWindow;

class DesktopAccessServices : public AccessServices {
 public:
  // `parent` parents the download's progress dialog; it may be null.
  explicit DesktopAccessServices(wxWindow* parent);

  long Execute(const std::vector<std::string>& argv) override;
  bool LaunchDefaultApplication(const std::string& path) override;
  bool LaunchDefaultBrowser(const std::string& url) override;
  std::string FindExecutable(const std::string& path) override;
  int Download(const std::string& message, const std::string& url,
               const std::string& path) override;
  void ShowError(const std::string& message, const std::string& caption) override;

  // Test hook.  When set, it answers every message box of document access
  // instead of the user: the download's abort question (style wxYES_NO |
  // wxNO_DEFAULT | wxICON_QUESTION; return wxYES or wxNO) and the error
  // boxes (style wxOK | wxICON_ERROR; the result is ignored).  It receives
  // message, caption and style.  Clear it with an empty function.
  using MessageBoxHook =
      std::function<int(const std::string& message, const std::string& caption, long style)>;
  static MessageBoxHook& TestMessageBoxHook();

 private:
  wxWindow* parent_;
};

// Shorter name used by the window code.
using DesktopServices = DesktopAccessServices;
