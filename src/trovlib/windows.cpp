// The per-user registry of top-level windows: one file per window name in
// the runtime directory, holding the X11 window id in decimal.
#include <cerrno>
#include <cstdlib>
#include <string>

#include "platform/files.h"
#include "platform/paths.h"
#include "trovlib/trovlib.h"

namespace {

// The name becomes part of a file name: anything but letters, digits, '-',
// '_' and '.' is replaced, so that no name can reach outside the directory.
std::string RegistryFile(const std::string& runtime, const char* name) {
  std::string file = runtime + "/window-";
  for (const char* p = name; *p; ++p) {
    char c = *p;
    bool plain = (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z') || (c >= '0' && c <= '9') ||
                 c == '-' || c == '_' || c == '.';
    file += plain ? c : '_';
  }
  return file;
}

}  // namespace

void TrovPublishWindow(const char* name, unsigned long handle) {
  if (name == nullptr) return;
  std::string error;
  std::string runtime = RuntimeDirectory(&error);
  if (runtime.empty()) {
    TrovMessage("ERROR: RuntimeDirectory ", error.c_str(), 5);
    return;
  }
  std::string file = RegistryFile(runtime, name);
  // Written aside and renamed, so that a reader never sees half a number.
  if (!ReplaceFile(file, std::to_string(handle) + "\n"))
    TrovMessage("ERROR: TrovPublishWindow ", (file + ": cannot be written").c_str(), 5);
}

unsigned long TrovLookupWindow(const char* name) {
  if (name == nullptr) return 0;
  std::string error;
  std::string runtime = RuntimeDirectory(&error);
  if (runtime.empty()) {
    TrovMessage("ERROR: RuntimeDirectory ", error.c_str(), 5);
    return 0;
  }
  std::string text;
  if (!ReadWholeFile(RegistryFile(runtime, name), text, 31) || text.empty()) return 0;
  const char* buffer = text.c_str();
  if (buffer[0] < '0' || buffer[0] > '9') return 0;
  char* end = nullptr;
  errno = 0;
  unsigned long handle = std::strtoul(buffer, &end, 10);
  if (errno != 0 || (*end != '\0' && *end != '\n')) return 0;
  return handle;
}
