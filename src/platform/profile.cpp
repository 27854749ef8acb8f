// INI file reading with the rules of the Windows profile API.
#include "platform/profile.h"

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <cstdint>
#include <cstring>
#include <memory>
#include <mutex>
#include <string>
#include <unordered_map>
#include <utility>
#include <vector>

#include "platform/files.h"

namespace {

constexpr const char* kDefaultSystemDirectory = "/etc/lomari";
// Beyond this a file is no INI file anyone wrote by hand; read its start only.
constexpr std::size_t kMaxFileBytes = 64u << 20;

struct Section {
  std::string name;
  std::vector<std::pair<std::string, std::string>> entries;  // key, value; file order
  std::unordered_map<std::string, std::size_t> by_key;       // lower-case key -> entry
};

struct Profile {
  std::vector<Section> sections;                         // file order
  std::unordered_map<std::string, std::size_t> by_name;  // lower-case name -> section
};

std::string Lower(const std::string& text) {
  std::string out(text);
  for (char& c : out)
    if (c >= 'A' && c <= 'Z') c = static_cast<char>(c - 'A' + 'a');
  return out;
}

bool IsBlank(char c) { return c == ' ' || c == '\t'; }

std::string Trim(const char* begin, const char* end) {
  while (begin < end && IsBlank(*begin)) ++begin;
  while (end > begin && IsBlank(end[-1])) --end;
  return std::string(begin, end);
}

// Parses the text up to `length` bytes or its first NUL, whichever comes
// first: what follows a NUL is not text.  Lines end at LF, CR or both.
std::unique_ptr<Profile> Parse(const char* text, std::size_t length) {
  auto profile = std::make_unique<Profile>();
  if (text == nullptr) return profile;
  const char* nul = static_cast<const char*>(std::memchr(text, '\0', length));
  const char* end = nul ? nul : text + length;
  const char* p = text;
  if (end - p >= 3 && std::memcmp(p, "\xEF\xBB\xBF", 3) == 0) p += 3;  // UTF-8 mark

  Section* current = nullptr;
  while (p < end) {
    const char* line_end = p;
    while (line_end < end && *line_end != '\n' && *line_end != '\r') ++line_end;
    const char* q = p;
    p = line_end < end ? line_end + 1 : end;
    while (q < line_end && IsBlank(*q)) ++q;
    if (q == line_end || *q == ';') continue;

    if (*q == '[') {
      const char* close = static_cast<const char*>(std::memchr(q + 1, ']', line_end - q - 1));
      std::string name = Trim(q + 1, close ? close : line_end);
      std::string lower = Lower(name);
      auto found = profile->by_name.find(lower);
      if (found == profile->by_name.end()) {
        // Sections of the same name are read as one.
        found = profile->by_name.emplace(lower, profile->sections.size()).first;
        profile->sections.push_back(Section{name, {}, {}});
      }
      current = &profile->sections[found->second];
      continue;
    }

    const char* equals = static_cast<const char*>(std::memchr(q, '=', line_end - q));
    if (current == nullptr || equals == nullptr) continue;  // outside a section, or no key
    std::string key = Trim(q, equals);
    if (key.empty()) continue;
    std::string value = Trim(equals + 1, line_end);
    if (value.size() >= 2 && (value.front() == '"' || value.front() == '\'') &&
        value.back() == value.front())
      value = value.substr(1, value.size() - 2);
    // Every key line is listed, duplicates included, as the system's own
    // API lists them; a value lookup takes the first.
    current->by_key.emplace(Lower(key), current->entries.size());
    current->entries.emplace_back(std::move(key), std::move(value));
  }
  return profile;
}

unsigned long CopyValue(const std::string& value, char* buffer, unsigned long size) {
  if (buffer == nullptr || size == 0) return 0;
  std::size_t n = std::min<std::size_t>(value.size(), size - 1);
  std::memcpy(buffer, value.data(), n);
  buffer[n] = '\0';
  return static_cast<unsigned long>(n);
}

// Names each followed by a NUL, the list by one more.  A list that does not
// fit is cut, its last name cut short, and still ends in two NULs; the
// result is then size - 2.
unsigned long CopyList(const std::vector<const std::string*>& names, char* buffer,
                       unsigned long size) {
  if (buffer == nullptr || size == 0) return 0;
  if (size == 1) {
    buffer[0] = '\0';
    return 0;
  }
  std::size_t pos = 0;
  for (const std::string* name : names) {
    if (pos + name->size() + 1 > size - 1) {  // the final NUL needs the last byte
      std::size_t room = pos < size - 2 ? size - 2 - pos : 0;
      std::memcpy(buffer + pos, name->data(), std::min(room, name->size()));
      buffer[size - 2] = '\0';
      buffer[size - 1] = '\0';
      return size - 2;
    }
    std::memcpy(buffer + pos, name->data(), name->size());
    pos += name->size();
    buffer[pos++] = '\0';
  }
  buffer[pos] = '\0';
  if (pos == 0) buffer[1] = '\0';  // an empty list still reads as one
  return static_cast<unsigned long>(pos);
}

unsigned long Answer(const Profile* profile, const char* section, const char* key, const char* def,
                     char* buffer, unsigned long size) {
  const std::string fallback = def ? def : "";
  if (section == nullptr) {  // list the section names
    std::vector<const std::string*> names;
    if (profile)
      for (const auto& s : profile->sections) names.push_back(&s.name);
    return CopyList(names, buffer, size);
  }
  const Section* found = nullptr;
  if (profile) {
    auto it = profile->by_name.find(Lower(section));
    if (it != profile->by_name.end()) found = &profile->sections[it->second];
  }
  if (key == nullptr) {
    std::vector<const std::string*> names;
    if (found) {
      for (const auto& entry : found->entries) names.push_back(&entry.first);
    } else if (!fallback.empty()) {
      names.push_back(&fallback);
    }
    return CopyList(names, buffer, size);
  }
  if (found) {
    auto it = found->by_key.find(Lower(key));
    if (it != found->by_key.end())
      return CopyValue(found->entries[it->second].second, buffer, size);
  }
  return CopyValue(fallback, buffer, size);
}

struct CachedFile {
  FileStamp stamp;
  std::shared_ptr<const Profile> profile;
  std::uint64_t checkedInBatch = 0;  // the batch whose first lookup checked it
};

// The batch open on this thread (0: none); batches are numbered from 1.
thread_local std::uint64_t t_batch = 0;
std::atomic<std::uint64_t> g_lastBatch{0};

std::mutex& CacheMutex() {
  static std::mutex mutex;
  return mutex;
}

std::unordered_map<std::string, CachedFile>& Cache() {
  static std::unordered_map<std::string, CachedFile> cache;
  return cache;
}

std::string& SystemDirectory() {
  static std::string dir = kDefaultSystemDirectory;
  return dir;
}

// A bare name lives in the system directory; names there are matched
// ignoring case, as they would be on the original platform.
std::string ResolvePath(const char* file) {
  std::string path(file);
  for (char& c : path)
    if (c == '\\') c = '/';
  if (path.find('/') != std::string::npos) return path;
  std::string dir;
  {
    std::lock_guard<std::mutex> lock(CacheMutex());
    dir = SystemDirectory();
  }
  std::string exact = dir + "/" + path;
  if (PathExists(exact)) return exact;
  std::vector<DirectoryEntry> entries;
  if (ListDirectory(dir, entries)) {
    const std::string wanted = Lower(path);
    for (const DirectoryEntry& entry : entries)
      if (Lower(entry.name) == wanted) return dir + "/" + entry.name;
  }
  return exact;
}

std::shared_ptr<const Profile> Load(const std::string& path) {
  const std::uint64_t batch = t_batch;
  if (batch != 0) {
    std::lock_guard<std::mutex> lock(CacheMutex());
    auto it = Cache().find(path);
    if (it != Cache().end() && it->second.checkedInBatch == batch) return it->second.profile;
  }
  FileStamp stamp;
  const bool present = StampOf(path, stamp) && stamp.regular;
  std::lock_guard<std::mutex> lock(CacheMutex());
  auto& cache = Cache();
  auto it = cache.find(path);
  if (!present) {
    // Missing files are remembered too, so that a batch asks once.
    if (batch != 0) cache[path] = CachedFile{FileStamp{}, nullptr, batch};
    return nullptr;
  }
  if (it != cache.end() && it->second.profile && it->second.stamp == stamp) {
    it->second.checkedInBatch = batch;
    return it->second.profile;
  }
  std::string text;
  if (!ReadWholeFile(path, text, kMaxFileBytes)) return nullptr;
  std::shared_ptr<const Profile> profile = Parse(text.data(), text.size());
  cache[path] = CachedFile{stamp, profile, batch};
  return profile;
}

}  // namespace

DWORD GetPrivateProfileStringA(const char* section, const char* key, const char* def, char* buffer,
                               DWORD size, const char* file) {
  std::shared_ptr<const Profile> profile;
  if (file != nullptr && *file != '\0') profile = Load(ResolvePath(file));
  return Answer(profile.get(), section, key, def, buffer, size);
}

ProfileBatch::ProfileBatch() : outermost_(t_batch == 0) {
  if (outermost_) t_batch = ++g_lastBatch;
}

ProfileBatch::~ProfileBatch() {
  if (outermost_) t_batch = 0;
}

void ProfileCacheClear() {
  std::lock_guard<std::mutex> lock(CacheMutex());
  Cache().clear();
}

unsigned long ProfileStringFromText(const char* text, std::size_t length, const char* section,
                                    const char* key, const char* def, char* buffer,
                                    unsigned long size) {
  std::unique_ptr<Profile> profile = Parse(text, length);
  return Answer(profile.get(), section, key, def, buffer, size);
}

void ProfileSetSystemDirectory(const char* dir) {
  std::lock_guard<std::mutex> lock(CacheMutex());
  SystemDirectory() = (dir && *dir) ? dir : kDefaultSystemDirectory;
}
