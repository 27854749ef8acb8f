// The per-user instance lock.
#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "platform/files.h"
#include "platform/instance_lock.h"

InstanceLock::~InstanceLock() { Release(); }

bool InstanceLock::Create(const std::string& name, const std::string& directory) {
  Release();
  another_ = false;
  error_.clear();
  const std::string dir = directory.empty() ? HomeDirectory() : directory;
  path_ = dir + "/." + name + ".lock";

  // O_CLOEXEC: a viewer started by the program must not inherit the lock and
  // keep it after the program ends.  O_NOFOLLOW: never lock through a link.
  const int fd = open(path_.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0600);
  if (fd < 0) {
    error_ = path_ + ": " + std::strerror(errno);
    return false;
  }
  int rc;
  do {
    rc = flock(fd, LOCK_EX | LOCK_NB);
  } while (rc != 0 && errno == EINTR);
  if (rc != 0) {
    const int error = errno;
    close(fd);
    if (error == EWOULDBLOCK) {
      another_ = true;
    } else {
      error_ = path_ + ": " + std::strerror(error);
    }
    return false;
  }
  fd_ = fd;

  // The pid is only for people looking at the file; the lock is the flock.
  const std::string pid = std::to_string(static_cast<long>(getpid())) + "\n";
  if (ftruncate(fd_, 0) == 0) {
    const ssize_t written = pwrite(fd_, pid.data(), pid.size(), 0);
    (void)written;
  }
  return true;
}

void InstanceLock::Release() {
  if (fd_ >= 0) {
    close(fd_);  // closing the only descriptor drops the flock
    fd_ = -1;
  }
}
