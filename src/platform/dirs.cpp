// Directory helpers built on files.h.
#include "platform/dirs.h"

#include "platform/files.h"

bool MakeDirectories(const std::string& path) {
  if (path.empty() || IsDirectory(path)) return !path.empty();
  const std::size_t slash = path.find_last_of('/');
  if (slash != std::string::npos && slash > 0 && !MakeDirectories(path.substr(0, slash)))
    return false;
  return MakeDirectory(path);
}
