// Part files on POSIX: mkostemp names them, flock marks them as owned.  The
// lock belongs to the open file, so it goes with the process however the
// process ends; O_CLOEXEC keeps it out of the viewers the program starts.
#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <vector>

#include "platform/files.h"
#include "platform/partfile.h"

namespace {

constexpr const char* kPartSuffix = ".part-";
constexpr std::size_t kRandomPart = 6;  // the XXXXXX of mkostemp

// True when `path` still names the file open as `fd`.
bool StillNamed(int fd, const std::string& path) {
  struct stat open, named;
  return fstat(fd, &open) == 0 && stat(path.c_str(), &named) == 0 && open.st_dev == named.st_dev &&
         open.st_ino == named.st_ino;
}

// EWOULDBLOCK: someone holds it.  Any other failure: the file system has no
// locks, and nobody can tell a live writer from a dead one there.
bool LockNow(int fd, bool& unsupported) {
  if (flock(fd, LOCK_EX | LOCK_NB) == 0) return true;
  unsupported = errno != EWOULDBLOCK;
  return false;
}

}  // namespace

PartFile::~PartFile() { Remove(); }

bool PartFile::Create(const std::string& target) {
  Remove();
  // A sweeper may take the new file for abandoned between its creation and
  // its lock; then the name is gone, or taken, and another one is tried.
  for (int attempt = 0; attempt < 8; ++attempt) {
    std::string name = target + kPartSuffix + std::string(kRandomPart, 'X');
    const int fd = mkostemp(name.data(), O_CLOEXEC);
    if (fd < 0) return false;
    bool unsupported = false;
    if ((LockNow(fd, unsupported) || unsupported) && StillNamed(fd, name)) {
      fchmod(fd, 0644);
      fd_ = fd;
      path_ = name;
      return true;
    }
    close(fd);
  }
  return false;
}

bool PartFile::Write(const char* data, std::size_t size) {
  while (size > 0) {
    const ssize_t n = write(fd_, data, size);
    if (n < 0 && errno == EINTR) continue;
    if (n <= 0) return false;
    data += n;
    size -= static_cast<std::size_t>(n);
  }
  return true;
}

bool PartFile::MoveTo(const std::string& target) {
  if (fd_ < 0 || rename(path_.c_str(), target.c_str()) != 0) return false;
  close(fd_);
  fd_ = -1;
  path_.clear();
  return true;
}

void PartFile::Remove() {
  if (fd_ < 0) return;
  unlink(path_.c_str());  // while still locked, so no sweeper sees it half gone
  close(fd_);
  fd_ = -1;
  path_.clear();
}

int RemoveAbandonedPartFiles(const std::string& target) {
  const std::size_t cut = target.rfind('/');
  const std::string directory = cut == std::string::npos ? "." : target.substr(0, cut + 1);
  const std::string prefix = target.substr(cut == std::string::npos ? 0 : cut + 1) + kPartSuffix;
  std::vector<DirectoryEntry> entries;
  if (!ListDirectory(directory, entries)) return 0;
  int removed = 0;
  for (const DirectoryEntry& entry : entries) {
    if (!entry.regular || entry.name.size() != prefix.size() + kRandomPart ||
        entry.name.compare(0, prefix.size(), prefix) != 0)
      continue;
    const std::string path = directory + entry.name;
    const int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK);
    if (fd < 0) continue;
    bool unsupported = false;
    // Locked now by us: its writer is gone.  Unless it was moved into place
    // meanwhile, the name is still the one we opened.
    if (LockNow(fd, unsupported) && StillNamed(fd, path) && unlink(path.c_str()) == 0) ++removed;
    close(fd);
  }
  return removed;
}
