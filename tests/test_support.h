// Small helpers shared by the tests: temporary directories, environment
// overrides and capture of the library's messages.
#pragma once

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <optional>
#include <string>
#include <vector>

#include "trovlib/trovlib.h"

namespace testing_support {

// A fresh directory under the system's temporary directory, removed with
// everything in it when the object goes.
class TempDir {
 public:
  TempDir() {
    std::string tmpl = (std::filesystem::temp_directory_path() / "docuvane-test-XXXXXX").string();
    std::vector<char> buf(tmpl.begin(), tmpl.end());
    buf.push_back('\0');
    if (mkdtemp(buf.data()) == nullptr) std::abort();
    path_ = buf.data();
  }
  ~TempDir() {
    std::error_code ec;
    std::filesystem::remove_all(path_, ec);
  }
  TempDir(const TempDir&) = delete;
  TempDir& operator=(const TempDir&) = delete;

  const std::string& path() const { return path_; }
  std::string operator/(const std::string& rel) const { return path_ + "/" + rel; }

  // Writes a file (creating its directories) and returns its full path.
  std::string Write(const std::string& rel, const std::string& content) const {
    std::filesystem::path p = std::filesystem::path(path_) / rel;
    std::filesystem::create_directories(p.parent_path());
    std::ofstream out(p, std::ios::binary | std::ios::trunc);
    out.write(content.data(), static_cast<std::streamsize>(content.size()));
    return p.string();
  }

 private:
  std::string path_;
};

// Sets (or, with nullopt, unsets) an environment variable for the lifetime
// of the object and restores it afterwards.
class ScopedEnv {
 public:
  ScopedEnv(const char* name, std::optional<std::string> value) : name_(name) {
    if (const char* old = std::getenv(name)) old_ = std::string(old);
    if (value) setenv(name, value->c_str(), 1);
    else unsetenv(name);
    TrovResetCaches();
  }
  ~ScopedEnv() {
    if (old_) setenv(name_.c_str(), old_->c_str(), 1);
    else unsetenv(name_.c_str());
    TrovResetCaches();
  }
  ScopedEnv(const ScopedEnv&) = delete;
  ScopedEnv& operator=(const ScopedEnv&) = delete;

 private:
  std::string name_;
  std::optional<std::string> old_;
};

struct CapturedMessage {
  std::string prefix;
  std::string text;
  int level;
  std::string line() const { return prefix + text; }
};

// Collects every library message while it lives.
class MessageCapture {
 public:
  MessageCapture() {
    TrovSetMessageSink([this](const char* prefix, const char* text, int level) {
      messages_.push_back({prefix ? prefix : "", text ? text : "", level});
    });
  }
  ~MessageCapture() { TrovSetMessageSink({}); }
  MessageCapture(const MessageCapture&) = delete;
  MessageCapture& operator=(const MessageCapture&) = delete;

  const std::vector<CapturedMessage>& messages() const { return messages_; }
  void clear() { messages_.clear(); }
  // True when some message's prefix + text contains `needle`.
  bool Contains(const std::string& needle) const {
    for (const auto& m : messages_)
      if (m.line().find(needle) != std::string::npos) return true;
    return false;
  }
  // The level of the first message whose prefix + text contains `needle`, or -1.
  int LevelOf(const std::string& needle) const {
    for (const auto& m : messages_)
      if (m.line().find(needle) != std::string::npos) return m.level;
    return -1;
  }

 private:
  std::vector<CapturedMessage> messages_;
};

}  // namespace testing_support
