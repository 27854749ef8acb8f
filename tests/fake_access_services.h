// A recording stand-in for the desktop: what would have been started,
// opened, fetched or shown, without a display or network.
#pragma once

#include <functional>
#include <string>
#include <utility>
#include <vector>

#include "access/services.h"

namespace testing_support {

struct FakeAccessServices : AccessServices {
  struct DownloadCall {
    std::string message, url, path;
  };
  long Execute(const std::vector<std::string>& argv) override {
    executed.push_back(argv);
    return onExecute ? onExecute(argv) : executeResult;
  }
  bool LaunchDefaultApplication(const std::string& path) override {
    defaultApplication.push_back(path);
    return defaultApplicationResult;
  }
  bool LaunchDefaultBrowser(const std::string& url) override {
    browser.push_back(url);
    return browserResult;
  }
  std::string FindExecutable(const std::string& path) override {
    findExecutable.push_back(path);
    return reader;
  }
  int Download(const std::string& message, const std::string& url,
               const std::string& path) override {
    downloads.push_back({message, url, path});
    return onDownload ? onDownload(downloads.back()) : 0;
  }
  void ShowError(const std::string& message, const std::string& caption) override {
    errors.emplace_back(message, caption);
  }
  bool Untouched() const {  // nothing at all reached the desktop
    return executed.empty() && defaultApplication.empty() && browser.empty() && downloads.empty() &&
           errors.empty();
  }

  // Answers.
  long executeResult = 4242;
  std::function<long(const std::vector<std::string>&)> onExecute;
  bool defaultApplicationResult = true, browserResult = true;
  std::string reader;  // what FindExecutable gives
  std::function<int(const DownloadCall&)> onDownload;
  // Records.
  std::vector<std::vector<std::string>> executed;
  std::vector<std::string> defaultApplication, browser, findExecutable;
  std::vector<DownloadCall> downloads;
  std::vector<std::pair<std::string, std::string>> errors;
};

}  // namespace testing_support
