// The per-user registry of top-level windows: one file per window name in
// the runtime directory, holding the X11 window id in decimal.
#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <string>

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
  std::string temp = file + ".tmp" + std::to_string(getpid());
  int fd = open(temp.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600);
  if (fd < 0) {
    TrovMessage("ERROR: TrovPublishWindow ", (temp + ": cannot be written").c_str(), 5);
    return;
  }
  std::string text = std::to_string(handle) + "\n";
  bool ok = write(fd, text.data(), text.size()) == static_cast<ssize_t>(text.size());
  ok = (close(fd) == 0) && ok;
  if (!ok || rename(temp.c_str(), file.c_str()) != 0) {
    unlink(temp.c_str());
    TrovMessage("ERROR: TrovPublishWindow ", (file + ": cannot be written").c_str(), 5);
  }
}

unsigned long TrovLookupWindow(const char* name) {
  if (name == nullptr) return 0;
  std::string error;
  std::string runtime = RuntimeDirectory(&error);
  if (runtime.empty()) {
    TrovMessage("ERROR: RuntimeDirectory ", error.c_str(), 5);
    return 0;
  }
  int fd = open(RegistryFile(runtime, name).c_str(), O_RDONLY | O_CLOEXEC);
  if (fd < 0) return 0;
  char buffer[32];
  ssize_t n = read(fd, buffer, sizeof buffer - 1);
  close(fd);
  if (n <= 0) return 0;
  buffer[n] = '\0';
  if (buffer[0] < '0' || buffer[0] > '9') return 0;
  char* end = nullptr;
  errno = 0;
  unsigned long handle = std::strtoul(buffer, &end, 10);
  if (errno != 0 || (*end != '\0' && *end != '\n')) return 0;
  return handle;
}
