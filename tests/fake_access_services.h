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
  using Args = std::vector<std::string>;
  struct DownloadCall {
    std::string message, url, path;
  };
  // clang-format off
  long Execute(const Args& argv) override { return executed.push_back(argv), executeResult; }
  bool LaunchDefaultApplication(const std::string& path) override {
    return defaultApplication.push_back(path), defaultApplicationResult;
  }
  bool LaunchDefaultBrowser(const std::string& url) override { return browser.push_back(url), browserResult; }
  std::string FindExecutable(const std::string&) override { return reader; }
  int Download(const std::string& message, const std::string& url, const std::string& path) override {
    downloads.push_back({message, url, path});
    return onDownload ? onDownload(downloads.back()) : 0;
  }
  void ShowError(const std::string& m, const std::string& c) override { errors.emplace_back(m, c); }
  // clang-format on
  bool Untouched() const {  // nothing at all reached the desktop
    return executed.empty() && defaultApplication.empty() && downloads.empty() && errors.empty();
  }

  long executeResult = 4242;  // answers
  bool defaultApplicationResult = true, browserResult = true;
  std::string reader;  // what FindExecutable gives
  std::function<int(const DownloadCall&)> onDownload;
  std::vector<Args> executed;  // records
  Args defaultApplication, browser;
  std::vector<DownloadCall> downloads;
  std::vector<std::pair<std::string, std::string>> errors;
};

}  // namespace testing_support
