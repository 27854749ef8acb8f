// TrovSearch: categories, path patterns and the file-name index of each
// recursively searched tree.
#include <algorithm>
#include <chrono>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <deque>
#include <future>
#include <memory>
#include <set>
#include <string>
#include <string_view>
#include <unordered_map>
#include <utility>
#include <vector>

#include "platform/files.h"
#include "platform/program_dir.h"
#include "text/text.h"
#include "trovlib/lsr.h"
#include "trovlib/prefetch.h"
#include "trovlib/trovlib.h"
#include "trovlib/trovlib_internal.h"

namespace trovlib {
namespace {

constexpr const char* kDefaultIconThemes = "/usr/share/icons/hicolor:/usr/share/icons/Adwaita";
constexpr const char* kImageExtensions[] = {".png", ".xpm", ".bmp", ".ico"};
constexpr const char* kIconSizes[] = {"24x24", "22x22", "16x16", "32x32"};
constexpr int kMaxTreeDepth = 64;

// `name` with an image extension folded to lower case, or "" when its
// extension is no image extension.
std::string ImageName(std::string_view name) {
  const std::size_t dot = name.rfind('.');
  if (dot == std::string_view::npos || name.find('/', dot) != std::string_view::npos)
    return std::string();
  const std::string extension = Folded(std::string(name.substr(dot)));
  for (const char* known : kImageExtensions)
    if (extension == known) return std::string(name.substr(0, dot)) + extension;
  return std::string();
}

// Entries by a key, each key's entries chained in the order they were given:
// an open-addressed table of the first entry of every key.  Built once; the
// keys stay where they were.
class KeyTable {
 public:
  void Build(const std::vector<std::string_view>& keys) {
    std::size_t size = 16;
    while (size < 2 * keys.size()) size *= 2;
    slots_.assign(size, -1);
    next_.assign(keys.size(), -1);
    const std::size_t mask = size - 1;
    // From the last entry back, each one put in front of its key's chain.
    for (std::size_t i = keys.size(); i-- > 0;) {
      if (keys[i].empty()) continue;
      for (std::size_t slot = std::hash<std::string_view>()(keys[i]) & mask;;
           slot = (slot + 1) & mask) {
        const std::int32_t head = slots_[slot];
        if (head < 0 || keys[static_cast<std::size_t>(head)] == keys[i]) {
          next_[i] = head;
          slots_[slot] = static_cast<std::int32_t>(i);
          break;
        }
      }
    }
  }
  // The first entry of `key`, or -1.
  std::int32_t First(const std::vector<std::string_view>& keys, std::string_view key) const {
    if (slots_.empty() || key.empty()) return -1;
    const std::size_t mask = slots_.size() - 1;
    for (std::size_t slot = std::hash<std::string_view>()(key) & mask;; slot = (slot + 1) & mask) {
      const std::int32_t head = slots_[slot];
      if (head < 0 || keys[static_cast<std::size_t>(head)] == key) return head;
    }
  }
  std::int32_t Next(std::int32_t entry) const { return next_[static_cast<std::size_t>(entry)]; }

 private:
  std::vector<std::int32_t> slots_;
  std::vector<std::int32_t> next_;
};

// Every file below one directory, by base name.  Paths of one name keep the
// walk's order: shallower first, then by byte order of the names, so that the
// same tree always gives the same answer.
// Image files are also kept under their name with the extension folded to
// lower case: the trees this library reads were often made on file systems
// that ignore case, so "Docuvane.BMP" must answer for "Docuvane.bmp".
// All paths share one buffer: a tree of tens of thousands of files is then a
// few allocations, not one per file and name.
class TreeIndex {
 public:
  void Add(std::string_view path) {
    const std::size_t slash = path.rfind('/');
    const std::size_t nameAt = slash == std::string_view::npos ? 0 : slash + 1;
    entries_.push_back(Entry{paths_.size(), path.size(), nameAt});
    paths_.append(path);
    const std::string image = ImageName(path.substr(nameAt));
    imageKeys_.push_back(Span{imageText_.size(), image.size()});
    imageText_ += image;
  }

  void Finish() {
    names_.clear();
    images_.clear();
    names_.reserve(entries_.size());
    images_.reserve(entries_.size());
    for (std::size_t i = 0; i < entries_.size(); ++i) {
      names_.push_back(Path(i).substr(entries_[i].nameAt));
      images_.emplace_back(imageText_.data() + imageKeys_[i].at, imageKeys_[i].length);
    }
    byName_.Build(names_);
    byImage_.Build(images_);
  }

  std::string_view Path(std::size_t i) const {
    return std::string_view(paths_).substr(entries_[i].at, entries_[i].length);
  }

  // Calls `visit(path)` for the paths of this name (or image name) in walk
  // order, until it returns false.
  template <typename Visit>
  void ForEach(bool images, std::string_view name, Visit visit) const {
    const KeyTable& table = images ? byImage_ : byName_;
    const std::vector<std::string_view>& keys = images ? images_ : names_;
    for (std::int32_t i = table.First(keys, name); i >= 0; i = table.Next(i))
      if (!visit(Path(static_cast<std::size_t>(i)))) return;
  }

 private:
  struct Entry {
    std::size_t at, length, nameAt;
  };
  struct Span {
    std::size_t at, length;
  };
  std::string paths_;
  std::vector<Entry> entries_;
  std::string imageText_;
  std::vector<Span> imageKeys_;
  std::vector<std::string_view> names_, images_;
  KeyTable byName_, byImage_;
};

using SharedIndex = std::shared_ptr<const TreeIndex>;

std::unordered_map<std::string, SharedIndex>& Indexes() {
  static std::unordered_map<std::string, SharedIndex> indexes;
  return indexes;
}

std::string JoinPath(const std::string& dir, const std::string& name) {
  if (dir.empty()) return name;
  if (dir.back() == '/') return dir + name;
  return dir + "/" + name;
}

// Collapses runs of separators (a variable may end in one) and strips
// trailing ones, but keeps a lone "/".
std::string TrimDirectory(const std::string& text) {
  std::string dir;
  for (char c : text)
    if (c != '/' || dir.empty() || dir.back() != '/') dir += c;
  while (dir.size() > 1 && dir.back() == '/') dir.pop_back();
  return dir;
}

std::unique_ptr<TreeIndex> BuildIndex(const std::string& root) {
  auto index = std::make_unique<TreeIndex>();
  // The tree's own database when it is current, else a walk.
  if (ReadCurrentLsR(root, [&index](std::string_view path) { index->Add(path); })) {
    index->Finish();
    return index;
  }
  std::set<std::pair<std::uint64_t, std::uint64_t>> visited;  // symbolic links may form loops
  std::deque<std::pair<std::string, int>> pending;
  pending.emplace_back(root, 0);

  std::vector<DirectoryEntry> entries;
  while (!pending.empty()) {
    auto [dir, depth] = pending.front();
    pending.pop_front();
    FileStamp stamp;
    if (!StampOf(dir, stamp) || !stamp.directory) continue;
    if (!visited.insert({stamp.device, stamp.inode}).second) continue;
    if (!ListDirectory(dir, entries)) continue;
    std::sort(entries.begin(), entries.end(),
              [](const DirectoryEntry& a, const DirectoryEntry& b) { return a.name < b.name; });

    for (const DirectoryEntry& entry : entries) {
      std::string path = JoinPath(dir, entry.name);
      if (entry.regular) {
        index->Add(path);
      } else if (entry.directory && depth < kMaxTreeDepth) {
        pending.emplace_back(std::move(path), depth + 1);
      }
    }
  }
  index->Finish();
  return index;
}

// Indexes being built ahead of their first search (TrovPrefetchSearch), by
// root.  Guarded by the library mutex like Indexes(); the builders
// themselves touch neither.
std::unordered_map<std::string, std::shared_future<SharedIndex>>& Pending() {
  static std::unordered_map<std::string, std::shared_future<SharedIndex>> pending;
  return pending;
}

// The index of `root`, taken from its build ahead or built now.  The caller
// holds the library mutex; while a build ahead is still running the mutex is
// let go, so that searches of other trees do not wait for this one.
SharedIndex IndexOf(const std::string& root) {
  for (;;) {
    auto it = Indexes().find(root);
    if (it != Indexes().end()) return it->second;
    auto pending = Pending().find(root);
    if (pending == Pending().end()) return Indexes().emplace(root, BuildIndex(root)).first->second;
    const std::shared_future<SharedIndex> built = pending->second;
    if (built.wait_for(std::chrono::seconds(0)) != std::future_status::ready) {
      LibraryMutex().unlock();
      built.wait();
      LibraryMutex().lock();
      continue;  // the tables may have changed meanwhile
    }
    Pending().erase(pending);
    Indexes().emplace(root, built.get());
  }
}

// The name as the index sees it: '/' separators, no empty or "." steps.
// False for a name that is empty or climbs out of its tree with "..".
bool NormaliseName(const char* raw, std::string& name, bool& absolute) {
  std::string text(raw);
  for (char& c : text)
    if (c == '\\') c = '/';
  absolute = !text.empty() && text[0] == '/';
  name.clear();
  std::size_t start = 0;
  while (start <= text.size()) {
    std::size_t end = text.find('/', start);
    if (end == std::string::npos) end = text.size();
    std::string step = text.substr(start, end - start);
    start = end + 1;
    if (step.empty() || step == ".") continue;
    if (step == "..") return false;
    if (!name.empty()) name += '/';
    name += step;
  }
  return !name.empty();
}

// One place to look: a directory, alone or with everything below it.
struct SearchRoot {
  std::string dir;
  bool recursive;
};

void AddPatternRoots(const std::string& pattern, std::vector<SearchRoot>& roots) {
  std::vector<std::string> expanded;
  if (!ExpandPattern(pattern, expanded)) return;
  for (const auto& e : expanded) {
    bool recursive = e.size() >= 2 && e.compare(e.size() - 2, 2, "//") == 0;
    std::string dir = TrimDirectory(e);
    if (!dir.empty()) roots.push_back({dir, recursive});
  }
}

// How much an icon's directory is preferred: 24, 22, 16, 32 pixels, then
// anything else.
int IconSizeRank(std::string_view path, std::size_t from) {
  for (int i = 0; i < 4; ++i) {
    std::string step = std::string("/") + kIconSizes[i] + "/";
    if (path.find(step, from) != std::string::npos) return i;
  }
  return 4;
}

class Searcher {
 public:
  Searcher(const std::string& name, bool image_names, bool executable, bool rank_sizes)
      : executable_(executable), rank_sizes_(rank_sizes), image_names_(image_names) {
    std::size_t slash = name.rfind('/');
    std::string base = slash == std::string::npos ? name : name.substr(slash + 1);
    if (image_names && base.find('.') == std::string::npos) {
      for (const char* ext : kImageExtensions) variants_.push_back(name + ext);
    } else {
      variants_.push_back(name);
    }
  }

  // The best match below one root, or false.
  bool Find(const SearchRoot& root, std::string& found) const {
    if (!root.recursive) {
      for (const auto& v : variants_) {
        std::string path = JoinPath(root.dir, v);
        if (IsRegularFile(path, executable_)) {
          found = path;
          return true;
        }
      }
      return false;
    }
    // Image names are looked up with their extension in any case.
    const bool images = image_names_ && !ImageName(variants_.front()).empty();
    const SharedIndex index = IndexOf(root.dir);
    // Best is the lowest size rank, then the earliest variant, then the
    // earliest path; without ranking the first match wins at once.
    std::string_view best;
    bool haveBest = false;
    int best_rank = 5;
    for (const auto& given : variants_) {
      const std::string variant = images ? ImageName(given) : given;
      const std::size_t slash = variant.rfind('/');
      const std::string_view base = slash == std::string::npos
                                        ? std::string_view(variant)
                                        : std::string_view(variant).substr(slash + 1);
      index->ForEach(images, base, [&](std::string_view path) {
        if (slash != std::string::npos &&
            !(images ? HasTail(ImageName(path), variant) : HasTail(path, variant)))
          return true;
        if (executable_ && !IsRegularFile(std::string(path), true)) return true;
        const int rank = rank_sizes_ ? IconSizeRank(path, root.dir.size()) : 0;
        if (rank < best_rank) {
          best = path;
          haveBest = true;
          best_rank = rank;
        }
        return best_rank != 0;
      });
      if (best_rank == 0) break;
    }
    if (!haveBest) return false;
    found.assign(best.data(), best.size());
    return true;
  }

 private:
  // The name's directories must end the found path, step for step.
  static bool HasTail(std::string_view path, std::string_view tail) {
    if (path.size() <= tail.size()) return false;
    std::size_t at = path.size() - tail.size();
    return path[at - 1] == '/' && path.compare(at, tail.size(), tail) == 0;
  }

  std::vector<std::string> variants_;
  bool executable_;
  bool rank_sizes_;
  bool image_names_;
};

std::vector<std::string> IconThemes() {
  const char* themes = std::getenv("TROVLIB_ICON_THEMES");
  return SplitList(themes ? themes : kDefaultIconThemes);
}

// Each group of roots is searched with its own rules, in order.
struct Group {
  std::vector<SearchRoot> roots;
  bool image_names;
  bool rank_sizes;
};

// Where a search of `category` looks (the caller holds the library mutex).
std::vector<Group> GroupsOf(const std::string& category) {
  const bool program = category == "Program";
  std::vector<Group> groups;
  if (category == kDocumentationCategory) {
    groups.push_back({{}, false, false});
    AddPatternRoots("$TEXMF/doc//", groups.back().roots);
  } else if (program) {
    groups.push_back({{}, false, false});
    const char* path = std::getenv("PATH");
    for (const auto& dir : SplitList(path ? path : ""))
      groups.back().roots.push_back({TrimDirectory(dir), false});
    // Then the program's own directory, so that the tools installed or
    // built beside it (the PDF launcher) are found without PATH.
    const std::string own = ProgramDirectory();
    if (!own.empty()) groups.back().roots.push_back({TrimDirectory(own), false});
  } else if (category == "Icon") {
    groups.push_back({{}, true, true});
    AddPatternRoots("$TEXMF/Docuvane/icons//", groups.back().roots);
    for (const auto& theme : IconThemes()) {
      groups.push_back({{}, true, false});
      for (const char* size : kIconSizes)
        groups.back().roots.push_back({JoinPath(TrimDirectory(theme), size), true});
    }
  } else if (category == "Logo") {
    groups.push_back({{}, true, false});
    AddPatternRoots("$TEXMF/Docuvane//", groups.back().roots);
  } else {
    groups.push_back({{}, false, false});
    AddPatternRoots(category, groups.back().roots);
  }

  return groups;
}

}  // namespace

void ResetSearchCaches() {
  for (auto& pending : Pending()) pending.second.wait();
  Pending().clear();
  Indexes().clear();
}

}  // namespace trovlib

const char* TrovSearch(const char* spec, const char* name) {
  using namespace trovlib;
  thread_local std::string result;  // each thread keeps its own answer
  if (spec == nullptr || name == nullptr) return nullptr;
  std::string normal;
  bool absolute = false;
  if (!NormaliseName(name, normal, absolute)) return nullptr;

  std::lock_guard<std::mutex> lock(LibraryMutex());
  const std::string category(spec);
  const bool program = category == "Program";
  if (absolute) {
    std::string path = "/" + normal;
    if (!IsRegularFile(path, program)) return nullptr;
    result = path;
    return result.c_str();
  }

  const std::vector<Group> groups = GroupsOf(category);
  for (const auto& group : groups) {
    Searcher searcher(normal, group.image_names, program, group.rank_sizes);
    for (const auto& root : group.roots) {
      std::string found;
      if (searcher.Find(root, found)) {
        result = found;
        return result.c_str();
      }
    }
  }
  return nullptr;
}

void TrovPrefetchSearch(const char* spec) {
  using namespace trovlib;
  if (spec == nullptr) return;
  std::lock_guard<std::mutex> lock(LibraryMutex());
  for (const Group& group : GroupsOf(spec)) {
    for (const SearchRoot& root : group.roots) {
      if (!root.recursive || Indexes().count(root.dir) || Pending().count(root.dir)) continue;
      // std::async with the async policy: a thread of its own, joined by
      // the first search that needs the index (or by a reset).
      const std::string dir = root.dir;
      Pending().emplace(dir, std::async(std::launch::async, [dir] {
                               return SharedIndex(BuildIndex(dir));
                             }).share());
    }
  }
}

void TrovResetCaches() {
  std::lock_guard<std::mutex> lock(trovlib::LibraryMutex());
  trovlib::ResetSearchCaches();
}
