// Library variables, pattern expansion, TrovVar, TrovFind and TrovINIFile.
#include <cstdlib>
#include <string>
#include <vector>

#include "platform/files.h"
#include "trovlib/trovlib.h"
#include "trovlib/trovlib_internal.h"

namespace trovlib {
namespace {

// A pattern whose variables hold many trees could multiply without bound;
// nobody has this many trees.
constexpr std::size_t kMaxExpansions = 256;

std::string Environment(const char* name) {
  const char* value = std::getenv(name);
  return value ? std::string(value) : std::string();
}

bool IsNameChar(char c) {
  return (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z') || (c >= '0' && c <= '9') || c == '_';
}

}  // namespace

std::mutex& LibraryMutex() {
  static std::mutex mutex;
  return mutex;
}

std::vector<std::string> SplitList(const std::string& text) {
  std::vector<std::string> parts;
  std::size_t start = 0;
  while (start <= text.size()) {
    std::size_t end = text.find(':', start);
    if (end == std::string::npos) end = text.size();
    if (end > start) parts.push_back(text.substr(start, end - start));
    start = end + 1;
  }
  return parts;
}

bool LookupVariable(const std::string& name, std::string& value) {
  if (name.empty()) return false;
  value = Environment(name.c_str());
  if (!value.empty()) return true;

  if (name == "TEXMF") {
    value = DOCUVANE_SAMPLE_TEXMF;
    return true;
  }
  if (name == "TEXDIR") return LookupVariable("TEXMF", value);
  if (name == "VARTEX") {
    std::string cache = Environment("XDG_CACHE_HOME");
    value = cache.empty() ? HomeDirectory() + "/.cache/lomari" : cache + "/lomari";
    return true;
  }
  return false;
}

bool ExpandPattern(const std::string& pattern, std::vector<std::string>& out, bool unset_as_empty) {
  std::vector<std::string> results(1);
  auto append_literal = [&results](const std::string& text) {
    for (auto& r : results) r += text;
  };

  std::size_t i = 0;
  while (i < pattern.size()) {
    char c = pattern[i];
    if (c != '$') {
      append_literal(std::string(1, c == '\\' ? '/' : c));
      ++i;
      continue;
    }
    std::string name;
    std::size_t next = i + 1;
    if (next < pattern.size() && pattern[next] == '{') {
      std::size_t close = pattern.find('}', next + 1);
      if (close == std::string::npos) {
        append_literal("$");
        ++i;
        continue;
      }
      name = pattern.substr(next + 1, close - next - 1);
      next = close + 1;
    } else {
      while (next < pattern.size() && IsNameChar(pattern[next])) name += pattern[next++];
    }
    if (name.empty()) {
      append_literal("$");
      ++i;
      continue;
    }
    std::string value;
    if (!LookupVariable(name, value) && !unset_as_empty) return false;
    for (char& v : value)
      if (v == '\\') v = '/';
    std::vector<std::string> entries = SplitList(value);
    if (entries.empty()) {
      if (!unset_as_empty) return false;
      entries.emplace_back();
    }
    std::vector<std::string> grown;
    for (const auto& r : results)
      for (const auto& e : entries)
        if (grown.size() < kMaxExpansions) grown.push_back(r + e);
    results.swap(grown);
    i = next;
  }
  out.insert(out.end(), results.begin(), results.end());
  return true;
}

}  // namespace trovlib

using trovlib::LibraryMutex;

const char* TrovVar(const char* name) {
  static std::string result;
  if (name == nullptr) return nullptr;
  std::lock_guard<std::mutex> lock(LibraryMutex());
  std::string value;
  if (!trovlib::LookupVariable(name, value)) return nullptr;
  result = value;
  return result.c_str();
}

const char* TrovFind(const char* pattern) {
  static std::string result;
  std::lock_guard<std::mutex> lock(LibraryMutex());
  std::string inner = pattern ? pattern : "";
  if (inner.size() >= 3 && inner.compare(0, 2, "?<") == 0 && inner.back() == '>')
    inner = inner.substr(2, inner.size() - 3);

  // A variable without a value expands to nothing: the caller still gets a
  // directory-shaped string.  With several trees the first one is meant.
  std::vector<std::string> expanded;
  trovlib::ExpandPattern(inner, expanded, /*unset_as_empty=*/true);
  result = expanded.empty() ? std::string() : expanded.front();
  if (result.empty() || result.back() != '/') result += '/';
  return result.c_str();
}

const char* TrovINIFile(int kind) {
  static std::string result;
  std::lock_guard<std::mutex> lock(LibraryMutex());
  result.clear();
  if (kind != 1) return result.c_str();
  std::string texmf;
  trovlib::LookupVariable("TEXMF", texmf);
  for (char& c : texmf)
    if (c == '\\') c = '/';
  std::vector<std::string> trees = trovlib::SplitList(texmf);
  std::string first = trees.empty() ? std::string(".") : trees.front();
  while (first.size() > 1 && first.back() == '/') first.pop_back();
  result = first + "/lomari.ini";
  return result.c_str();
}
