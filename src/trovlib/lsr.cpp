#include "trovlib/lsr.h"

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <string_view>
#include <unordered_map>

#include "platform/change_time.h"
#include "platform/files.h"

namespace trovlib {
namespace {

constexpr std::size_t kMaxDatabaseSize = 256u << 20;
const char* const kMagic[] = {
    "% ls-R -- filename database for kpathsea; do not change this line.",
    "% ls-R -- maintained by MakeTeXls-R; do not change this line.",
};

// The directory that holds the nearest ls-R at or above `root`, or "".
std::string FindDatabase(const std::string& root, FileStamp& stamp) {
  std::string dir = root;
  for (;;) {
    if (StampOf(dir + "/ls-R", stamp) && stamp.regular) return dir;
    const std::size_t slash = dir.rfind('/');
    if (slash == std::string::npos || slash == 0) return std::string();
    dir.erase(slash);
  }
}

// A section's directory relative to the database's, without "./" and
// trailing separators; "" for the database's own directory.
std::string SectionDirectory(std::string line) {
  line.pop_back();  // the ':'
  while (!line.empty() && line.back() == '/') line.pop_back();
  if (line == ".") return std::string();
  if (line.compare(0, 2, "./") == 0) line.erase(0, 2);
  return line;
}

std::size_t Depth(const std::string& path) {
  return static_cast<std::size_t>(std::count(path.begin(), path.end(), '/'));
}

// The walk's order: fewer steps first, then step by step in byte order.
bool WalkOrder(const std::string& a, const std::string& b) {
  const std::size_t da = Depth(a), db = Depth(b);
  if (da != db) return da < db;
  for (std::size_t i = 0;; ++i) {
    if (i == a.size() || i == b.size()) return a.size() < b.size();
    if (a[i] != b[i]) {
      if (a[i] == '/') return true;  // a's step ends first: it is a prefix
      if (b[i] == '/') return false;
      return static_cast<unsigned char>(a[i]) < static_cast<unsigned char>(b[i]);
    }
  }
}

}  // namespace

bool ReadCurrentLsR(const std::string& root, std::vector<std::string>& files) {
  files.clear();
  return ReadCurrentLsR(root, [&files](std::string_view path) { files.emplace_back(path); });
}

bool ReadCurrentLsR(const std::string& root, const std::function<void(std::string_view)>& each) {
  FileStamp database;
  const std::string top = FindDatabase(root, database);
  if (top.empty()) return false;
  std::string text;
  if (!ReadWholeFile(top + "/ls-R", text, kMaxDatabaseSize)) return false;
  const std::size_t firstEnd = text.find('\n');
  const std::string first = text.substr(0, firstEnd);
  if (std::none_of(std::begin(kMagic), std::end(kMagic), [&](const char* magic) {
        return first.compare(0, std::strlen(magic), magic) == 0;
      }))
    return false;

  // root relative to the database's directory: "" or "doc/latex".
  const std::string below = root.size() > top.size() ? root.substr(top.size() + 1) : std::string();
  auto inRoot = [&below](const std::string& dir) {
    return below.empty() || dir == below ||
           (dir.size() > below.size() && dir.compare(0, below.size(), below) == 0 &&
            dir[below.size()] == '/');
  };

  // The sections inside root, each with its entries; a name that has a
  // section of its own is a directory, every other name a file.
  struct Section {
    std::string dir;
    std::vector<std::string_view> names;
    std::vector<std::string_view> subdirectories;  // names with a section of their own
  };
  std::vector<Section> sections;
  std::unordered_map<std::string, std::size_t> byDirectory;
  Section* current = nullptr;
  std::size_t at = firstEnd == std::string::npos ? text.size() : firstEnd + 1;
  while (at < text.size()) {
    std::size_t end = text.find('\n', at);
    if (end == std::string::npos) end = text.size();
    std::string_view line(text.data() + at, end - at);
    at = end + 1;
    if (!line.empty() && line.back() == '\r') line.remove_suffix(1);
    if (line.empty() || line[0] == '%') continue;
    if (line.back() == ':' && (line[0] == '.' || line[0] == '/')) {
      if (line[0] == '/') return false;  // written for another place
      const std::string dir = SectionDirectory(std::string(line));
      current = nullptr;
      if (!inRoot(dir)) continue;
      auto found = byDirectory.find(dir);
      if (found == byDirectory.end()) {
        found = byDirectory.emplace(dir, sections.size()).first;
        sections.push_back(Section{dir, {}, {}});
      }
      current = &sections[found->second];
      continue;
    }
    if (current == nullptr || line == "." || line == "..") continue;
    current->names.push_back(line);
  }
  if (!byDirectory.count(below)) return false;

  // Current: nothing below root has changed since the database was written.
  for (const Section& section : sections) {
    std::int64_t changed = 0;
    if (!ChangeTimeOf(section.dir.empty() ? top : top + "/" + section.dir, changed)) return false;
    // A change in the same clock tick as the database may have come after it.
    if (changed >= database.mtimeNs) return false;
  }

  for (const Section& section : sections) {
    if (section.dir == below) continue;
    const std::size_t slash = section.dir.rfind('/');
    const std::string parent =
        slash == std::string::npos ? std::string() : section.dir.substr(0, slash);
    auto found = byDirectory.find(parent);
    if (found == byDirectory.end()) continue;
    const std::string& dir = section.dir;
    sections[found->second].subdirectories.push_back(slash == std::string::npos
                                                         ? std::string_view(dir)
                                                         : std::string_view(dir).substr(slash + 1));
  }

  // The walk's order: directory by directory, shallower first and then by
  // the steps' byte order, each directory's names in byte order.
  std::vector<const Section*> order;
  order.reserve(sections.size());
  for (const Section& section : sections) order.push_back(&section);
  std::sort(order.begin(), order.end(),
            [](const Section* a, const Section* b) { return WalkOrder(a->dir, b->dir); });
  std::string path;
  for (const Section* section : order) {
    std::vector<std::string_view> names = section->names;
    std::vector<std::string_view> subdirectories = section->subdirectories;
    std::sort(names.begin(), names.end());
    std::sort(subdirectories.begin(), subdirectories.end());
    const std::string prefix = section->dir.empty() ? top + "/" : top + "/" + section->dir + "/";
    auto subdirectory = subdirectories.begin();
    for (std::string_view name : names) {
      while (subdirectory != subdirectories.end() && *subdirectory < name) ++subdirectory;
      if (subdirectory != subdirectories.end() && *subdirectory == name) continue;
      path.assign(prefix).append(name);
      each(path);
    }
  }
  return true;
}

}  // namespace trovlib
