// The per-user runtime directory.
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <string>

#include "platform/paths.h"

std::string RuntimeDirectory(std::string* error) {
  const char* base = std::getenv("XDG_RUNTIME_DIR");
  std::string dir = (base != nullptr && *base != '\0')
                        ? std::string(base) + "/lomari"
                        : "/tmp/lomari-" + std::to_string(static_cast<unsigned long>(geteuid()));

  if (mkdir(dir.c_str(), 0700) == 0) {
    // The umask may have taken bits away; the directory is ours, so set them.
    chmod(dir.c_str(), 0700);
  } else if (errno != EEXIST) {
    if (error != nullptr) *error = dir + ": " + std::strerror(errno);
    return std::string();
  }

  // lstat: a symbolic link planted by someone else is refused like any
  // other directory that is not our own private one.
  struct stat st;
  if (lstat(dir.c_str(), &st) != 0 || !S_ISDIR(st.st_mode) || st.st_uid != geteuid() ||
      (st.st_mode & 0777) != 0700) {
    if (error != nullptr) *error = dir + ": not a directory of this user with mode 0700";
    return std::string();
  }
  return dir;
}
