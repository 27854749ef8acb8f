#include <sys/stat.h>

#include "platform/change_time.h"

bool ChangeTimeOf(const std::string& path, std::int64_t& changeNs) {
  struct stat st {};
  if (stat(path.c_str(), &st) != 0) return false;
  changeNs = static_cast<std::int64_t>(st.st_ctim.tv_sec) * 1000000000 + st.st_ctim.tv_nsec;
  return true;
}
