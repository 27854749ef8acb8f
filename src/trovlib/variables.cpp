// Library variables, pattern expansion, TrovVar, TrovFind and TrovINIFile.
#include <cstdlib>
#include <string>
#include <vector>

#include "platform/dirs.h"
#include "platform/files.h"
#include "platform/findexec.h"
#include "trovlib/sample_tree.h"
#include "trovlib/trees.h"
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

std::string VarTexDirectory() {
  std::string value = Environment("VARTEX");
  if (!value.empty()) return value;
  std::string cache = Environment("XDG_CACHE_HOME");
  return cache.empty() ? HomeDirectory() + "/.cache/lomari" : cache + "/lomari";
}

std::string StampText(const std::string& path) {
  FileStamp stamp;
  if (!StampOf(path, stamp)) return path + " -";
  return path + " " + std::to_string(stamp.size) + " " + std::to_string(stamp.mtimeNs);
}

// What kpsewhich's answer depends on, apart from its configuration files.
std::string KpsewhichKey(const std::string& program) {
  std::string key = StampText(program);
  for (const char* name : {"HOME", "TEXMFHOME", "TEXMFLOCAL", "TEXMFDIST", "TEXMFCNF"})
    key += std::string("|") + name + "=" + Environment(name);
  return key;
}

std::vector<std::string> Lines(const std::string& text) {
  std::vector<std::string> lines;
  std::size_t start = 0;
  while (start < text.size()) {
    std::size_t end = text.find('\n', start);
    if (end == std::string::npos) end = text.size();
    lines.push_back(text.substr(start, end - start));
    start = end + 1;
  }
  return lines;
}

// The cache file: the key, then "cnf <stamp>" lines, then "tree <path>" lines.
bool ReadKpsewhichCache(const std::string& file, const std::string& key,
                        std::vector<std::string>& trees) {
  std::string text;
  if (!ReadWholeFile(file, text, 64 * 1024)) return false;
  std::vector<std::string> lines = Lines(text);
  if (lines.empty() || lines[0] != key) return false;
  trees.clear();
  for (std::size_t i = 1; i < lines.size(); ++i) {
    const std::string& line = lines[i];
    if (line.compare(0, 4, "cnf ") == 0) {
      const std::string stamped = line.substr(4);
      const std::string path = stamped.substr(0, stamped.find(' '));
      if (StampText(path) != stamped) return false;
    } else if (line.compare(0, 5, "tree ") == 0) {
      trees.push_back(line.substr(5));
    } else if (line != "end") {
      return false;
    }
  }
  return !lines.empty() && lines.back() == "end";
}

std::vector<std::string> AskKpsewhich(const std::string& program, std::string& cnfLines) {
  std::vector<std::string> trees;
  std::string output;
  // One process for the three variables: -var-value takes only one.
  const char* vars[] = {program.c_str(), "-expand-var=$TEXMFHOME:$TEXMFLOCAL:$TEXMFDIST", nullptr};
  if (!RunAndCapture(vars, output, 5000)) return trees;
  std::string value = Lines(output).empty() ? std::string() : Lines(output).front();
  // Brace lists and "!!" marks name trees too: take each directory.
  for (char& c : value)
    if (c == '{' || c == '}' || c == ',') c = ':';
  for (std::string tree : SplitList(value)) {
    while (tree.compare(0, 2, "!!") == 0) tree.erase(0, 2);
    if (!tree.empty()) trees.push_back(tree);
  }
  const char* cnf[] = {program.c_str(), "-all", "texmf.cnf", nullptr};
  if (RunAndCapture(cnf, output, 5000))
    for (const std::string& path : Lines(output))
      if (!path.empty()) cnfLines += "cnf " + StampText(path) + "\n";
  return trees;
}

std::vector<std::string> UsualTexLiveTrees() {
  std::vector<std::string> trees = {HomeDirectory() + "/texmf", "/usr/local/share/texmf",
                                    "/usr/share/texmf", "/usr/share/texlive/texmf-dist",
                                    "/usr/local/texlive/texmf-local"};
  // The newest yearly installation.
  for (const char* root : {"/usr/local/texlive", "/opt/texlive"}) {
    std::vector<DirectoryEntry> entries;
    std::string newest;
    if (ListDirectory(root, entries))
      for (const DirectoryEntry& e : entries)
        if (e.directory && e.name.size() == 4 && e.name[0] == '2' && e.name > newest)
          newest = e.name;
    if (!newest.empty()) trees.push_back(std::string(root) + "/" + newest + "/texmf-dist");
  }
  return trees;
}

std::string DefaultTexmf() {
  // Worked out once per process for the same environment.
  static std::string key, value;
  const std::string now = VarTexDirectory() + "|" + Environment("PATH") + "|" + HomeDirectory();
  if (now == key && !value.empty()) return value;
  const std::string user = UserTexTree();
  std::string joined;
  for (const std::string& tree :
       ChooseDefaultTrees(user, IsDirectory(user), InstalledTexTrees(), SampleTreeDirectory()))
    joined += (joined.empty() ? "" : ":") + tree;
  key = now;
  value = joined;
  return value;
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
    value = DefaultTexmf();
    return true;
  }
  if (name == "TEXDIR") {
    // A TEXMF of the user's own choosing holds the update files too;
    // otherwise they are the scanner's, in the user's tree (or the sample's).
    if (!Environment("TEXMF").empty()) return LookupVariable("TEXMF", value);
    const std::string texmf = DefaultTexmf();
    value = texmf == SampleTreeDirectory() ? texmf : UserTexTree();
    return true;
  }
  if (name == "VARTEX") {
    value = VarTexDirectory();
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
  thread_local std::string result;  // each thread keeps its own answer
  if (name == nullptr) return nullptr;
  std::lock_guard<std::mutex> lock(LibraryMutex());
  std::string value;
  if (!trovlib::LookupVariable(name, value)) return nullptr;
  result = value;
  return result.c_str();
}

const char* TrovFind(const char* pattern) {
  thread_local std::string result;  // each thread keeps its own answer
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
  thread_local std::string result;  // each thread keeps its own answer
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

std::string UserTexTree() { return trovlib::VarTexDirectory() + "/texmf"; }

std::vector<std::string> InstalledTexTrees() {
  using namespace trovlib;
  std::vector<std::string> candidates;
  const std::string program = FindOnPath("kpsewhich");
  if (!program.empty()) {
    const std::string cacheFile = VarTexDirectory() + "/kpsewhich-trees";
    const std::string key = KpsewhichKey(program);
    if (!ReadKpsewhichCache(cacheFile, key, candidates)) {
      std::string cnfLines;
      candidates = AskKpsewhich(program, cnfLines);
      std::string text = key + "\n" + cnfLines;
      for (const std::string& tree : candidates) text += "tree " + tree + "\n";
      // Only a user who has a TeX installation gets the file.
      if (!candidates.empty() && MakeDirectories(VarTexDirectory()))
        ReplaceFile(cacheFile, text + "end\n", 0644);
    }
  }
  if (candidates.empty()) candidates = UsualTexLiveTrees();
  std::vector<std::string> trees;
  for (std::string tree : candidates) {
    while (tree.size() > 1 && tree.back() == '/') tree.pop_back();
    bool seen = false;
    for (const std::string& t : trees) seen = seen || t == tree;
    if (!seen && IsDirectory(tree)) trees.push_back(tree);
  }
  return trees;
}

std::vector<std::string> ChooseDefaultTrees(const std::string& userTree, bool userTreeExists,
                                            const std::vector<std::string>& installed,
                                            const std::string& sampleTree) {
  if (installed.empty() && !userTreeExists) return {sampleTree};
  std::vector<std::string> trees = {userTree};
  for (const std::string& tree : installed)
    if (tree != userTree) trees.push_back(tree);
  return trees;
}
