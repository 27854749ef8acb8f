// Helpers shared by the tests: a temporary directory, environment overrides,
// and capture of the library's messages.
#pragma once

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <optional>
#include <string>
#include <vector>

#include "trovlib/trovlib.h"

namespace testing_support {

struct NoCopy {
  NoCopy() = default;
  NoCopy(const NoCopy&) = delete;
};

// A fresh directory, removed with its contents at the end.
class TempDir : NoCopy {
 public:
  TempDir() {
    std::string name = (std::filesystem::temp_directory_path() / "docuvane-test-XXXXXX").string();
    if (mkdtemp(name.data()) == nullptr) std::abort();
    path_ = name;
  }
  ~TempDir() { std::filesystem::remove_all(path_, ec_); }
  const std::string& path() const { return path_; }
  std::string operator/(const std::string& rel) const { return path_ + "/" + rel; }
  // Writes a file, making its directories; returns its path.
  std::string Write(const std::string& rel, const std::string& content) const {
    const std::filesystem::path p = std::filesystem::path(path_) / rel;
    std::filesystem::create_directories(p.parent_path());
    std::ofstream(p, std::ios::binary) << content;
    return p.string();
  }

 private:
  std::string path_;
  std::error_code ec_;
};

// Sets (nullopt: unsets) an environment variable while it lives.
class ScopedEnv : NoCopy {
 public:
  ScopedEnv(const char* name, std::optional<std::string> value) : name_(name) {
    if (const char* old = std::getenv(name)) old_ = old;
    Set(value);
  }
  ~ScopedEnv() { Set(old_); }

 private:
  void Set(const std::optional<std::string>& value) {
    value ? setenv(name_.c_str(), value->c_str(), 1) : unsetenv(name_.c_str());
    TrovResetCaches();
  }
  std::string name_;
  std::optional<std::string> old_;
};

inline std::string ReadAll(const std::filesystem::path& path) {
  std::ifstream in(path, std::ios::binary);
  return std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

struct CapturedMessage {
  std::string prefix, text;
  int level;
  std::string line() const { return prefix + text; }
};

// Collects every library message while it lives.
class MessageCapture : NoCopy {
 public:
  MessageCapture() {
    TrovSetMessageSink([this](const char* prefix, const char* text, int level) {
      messages_.push_back({prefix ? prefix : "", text ? text : "", level});
    });
  }
  ~MessageCapture() { TrovSetMessageSink({}); }
  const std::vector<CapturedMessage>& messages() const { return messages_; }
  void clear() { messages_.clear(); }
  bool Contains(const std::string& needle) const { return LevelOf(needle) != -1; }
  // The level of the first message whose line contains `needle`, or -1.
  int LevelOf(const std::string& needle) const {
    for (const auto& m : messages_)
      if (m.line().find(needle) != std::string::npos) return m.level;
    return -1;
  }

 private:
  std::vector<CapturedMessage> messages_;
};

}  // namespace testing_support
