// Desktop entries and the default application, after the XDG conventions.
#include <sys/stat.h>

#include <cstdlib>
#include <fstream>

#include "platform/desktop_entry.h"
#include "platform/findexec.h"
#include "text/text.h"

namespace {

constexpr int kHelperTimeoutMs = 5000;

// The escapes of a desktop file's string values: \s \n \t \r \\.
std::string Unescape(const std::string& value) {
  std::string out;
  for (std::size_t i = 0; i < value.size(); ++i) {
    if (value[i] != '\\' || i + 1 == value.size()) {
      out += value[i];
      continue;
    }
    switch (char c = value[++i]) {
      case 's':
        out += ' ';
        break;
      case 'n':
        out += '\n';
        break;
      case 't':
        out += '\t';
        break;
      case 'r':
        out += '\r';
        break;
      case '\\':
        out += '\\';
        break;
      default:
        out += '\\';
        out += c;
        break;  // kept for the Exec quoting to read
    }
  }
  return out;
}

std::vector<std::string> DataDirectories() {
  std::vector<std::string> dirs;
  const char* home = std::getenv("XDG_DATA_HOME");
  if (home && *home) {
    dirs.push_back(home);
  } else if (const char* h = std::getenv("HOME")) {
    dirs.push_back(std::string(h) + "/.local/share");
  }
  const char* system = std::getenv("XDG_DATA_DIRS");
  std::string list = system && *system ? system : "/usr/local/share:/usr/share";
  std::size_t start = 0;
  while (start < list.size()) {
    std::size_t end = list.find(':', start);
    if (end == std::string::npos) end = list.size();
    if (end > start) dirs.push_back(list.substr(start, end - start));
    start = end + 1;
  }
  return dirs;
}

// A desktop file id may stand for a file in a subdirectory: "a-b.desktop"
// is also looked for as "a/b.desktop".
std::string FindDesktopFile(const std::string& id) {
  if (id.empty() || id.find('/') != std::string::npos) return std::string();
  std::vector<std::string> names{id};
  std::string variant = id;
  for (std::size_t pos = variant.find('-'); pos != std::string::npos;
       pos = variant.find('-', pos + 1)) {
    variant[pos] = '/';
    names.push_back(variant);
  }
  for (const std::string& dir : DataDirectories()) {
    for (const std::string& name : names) {
      std::string path = dir + "/applications/" + name;
      struct stat st;
      if (stat(path.c_str(), &st) == 0 && S_ISREG(st.st_mode)) return path;
    }
  }
  return std::string();
}

}  // namespace

bool ReadDesktopEntry(const std::string& id, DesktopEntry& entry) {
  entry = DesktopEntry();
  entry.path = FindDesktopFile(id);
  std::ifstream in(entry.path);
  if (entry.path.empty() || !in) return false;
  const std::pair<const char*, std::string*> keys[] = {
      {"Exec", &entry.exec}, {"Name", &entry.name}, {"Icon", &entry.icon}};
  bool seen[3] = {false, false, false};
  bool inEntry = false;
  for (std::string line; std::getline(in, line);) {
    line = TrimBlanks(line);
    if (!line.empty() && line[0] == '[') {
      inEntry = line == "[Desktop Entry]";
      continue;
    }
    for (int k = 0; inEntry && k < 3; ++k) {
      const std::string key = keys[k].first;
      if (seen[k] || line.compare(0, key.size(), key) != 0) continue;
      std::string rest = TrimBlanks(line.substr(key.size()));
      if (rest.empty() || rest[0] != '=') continue;  // another key, or a localised one
      *keys[k].second = Unescape(TrimBlanks(rest.substr(1)));
      seen[k] = true;
    }
  }
  return !entry.exec.empty();
}

std::string DefaultApplicationId(const std::string& mimeType) {
  std::string output;
  const char* query[] = {"xdg-mime", "query", "default", mimeType.c_str(), nullptr};
  if (!RunAndCapture(query, output, kHelperTimeoutMs)) return std::string();
  std::size_t newline = output.find('\n');
  return TrimBlanks(newline == std::string::npos ? output : output.substr(0, newline));
}

std::vector<std::string> SplitDesktopExec(const std::string& value) {
  std::vector<std::string> words;
  std::string word;
  bool started = false;
  bool quoted = false;
  for (std::size_t i = 0; i < value.size(); ++i) {
    char c = value[i];
    if (quoted) {
      if (c == '\\' && i + 1 < value.size()) {
        word += value[++i];
      } else if (c == '"') {
        quoted = false;
      } else {
        word += c;
      }
    } else if (c == ' ' || c == '\t') {
      if (started) words.push_back(word);
      word.clear();
      started = false;
    } else if (c == '"') {
      quoted = true;
      started = true;
    } else {
      word += c;
      started = true;
    }
  }
  if (started) words.push_back(word);
  return words;
}
