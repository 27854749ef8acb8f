// Separators.
#include "platform/paths.h"

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
