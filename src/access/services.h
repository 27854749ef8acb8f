// What document opening needs from the desktop: starting programs, the
// default application and browser, the file-type association, the download
// with its progress window and the user's message boxes.  The program uses
// the desktop implementation (access/desktop_services_gui.cpp); tests hand in
// fakes that record what would have been run or fetched.
#pragma once

#include <string>
#include <vector>

class AccessServices {
 public:
  virtual ~AccessServices() = default;
  // Starts argv[0] with the given arguments, asynchronously, without a
  // shell.  The result is wxExecute's: a process id, or 0 or less on failure.
  virtual long Execute(const std::vector<std::string>& argv) = 0;
  virtual bool LaunchDefaultApplication(const std::string& path) = 0;
  virtual bool LaunchDefaultBrowser(const std::string& url) = 0;
  // The program the desktop associates with the file's type, or "" (not found).
  virtual std::string FindExecutable(const std::string& path) = 0;
  // Fetches `url` into `path` under a progress window titled "Lomari Docs"
  // whose first message is `message`; returns what wxGet returns.
  virtual int Download(const std::string& message, const std::string& url,
                       const std::string& path) = 0;
  // A modal error box with an OK button.
  virtual void ShowError(const std::string& message, const std::string& caption) = 0;
};
