// Separators, the per-user runtime directory and the millisecond clock.
#include "platform/paths.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <string>

#include "trovlib/trovlib.h"

char* Fix_Slashes(char* path) {
  if (path == nullptr) return nullptr;
  for (char* p = path; *p; ++p)
    if (*p == '\\' || *p == '/') *p = kPathSeparator;
  return path;
}

std::string& Fix_Slashes(std::string& path) {
  for (char& c : path)
    if (c == '\\' || c == '/') c = kPathSeparator;
  return path;
}

std::string RuntimeDirectory() {
  const char* base = std::getenv("XDG_RUNTIME_DIR");
  std::string dir = (base != nullptr && *base != '\0')
                        ? std::string(base) + "/lomari"
                        : "/tmp/lomari-" + std::to_string(static_cast<unsigned long>(geteuid()));

  if (mkdir(dir.c_str(), 0700) == 0) {
    // The umask may have taken bits away; the directory is ours, so set them.
    chmod(dir.c_str(), 0700);
  } else if (errno != EEXIST) {
    TrovMessage("ERROR: RuntimeDirectory ", (dir + ": " + std::strerror(errno)).c_str(), 5);
    return std::string();
  }

  // lstat: a symbolic link planted by someone else is refused like any
  // other directory that is not our own private one.
  struct stat st;
  if (lstat(dir.c_str(), &st) != 0 || !S_ISDIR(st.st_mode) || st.st_uid != geteuid() ||
      (st.st_mode & 0777) != 0700) {
    TrovMessage("ERROR: RuntimeDirectory ",
                (dir + ": not a directory of this user with mode 0700").c_str(), 5);
    return std::string();
  }
  return dir;
}

unsigned long GetTickCount() {
  timespec now;
  clock_gettime(CLOCK_MONOTONIC, &now);
  return static_cast<unsigned long>(now.tv_sec) * 1000UL +
         static_cast<unsigned long>(now.tv_nsec / 1000000);
}
