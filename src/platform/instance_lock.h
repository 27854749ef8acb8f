// The per-user instance lock: one running Docuvane per user.
#pragma once

#include <string>

// An exclusive flock() on a file in the user's home directory, beside the
// framework's configuration store: every start of the user finds it there,
// whatever its environment says of runtime directories.  The kernel drops
// the lock when its holder ends in any way (SIGKILL included), so a lock
// left by a dead instance never blocks the next start, whatever the file
// holds.
class InstanceLock {
 public:
  InstanceLock() = default;
  ~InstanceLock();
  InstanceLock(const InstanceLock&) = delete;
  InstanceLock& operator=(const InstanceLock&) = delete;

  // Tries to take the lock `name` in `directory` (empty: the home
  // directory); the file is ".<name>.lock".
  // Returns true when this object holds it.  When the lock file cannot be
  // opened at all, false is returned with the reason in error();
  // IsAnotherRunning() then says false, so that the program still starts.
  bool Create(const std::string& name, const std::string& directory = std::string());

  // True when another process holds the lock.
  bool IsAnotherRunning() const { return another_; }
  // True when this object holds the lock.
  bool HoldsLock() const { return fd_ >= 0; }
  // Full path of the lock file (empty before Create).
  const std::string& path() const { return path_; }
  // Why the last Create could not lock at all; empty otherwise.
  const std::string& error() const { return error_; }

  // Releases the lock (the file stays: removing it would let two starts lock
  // two different files).
  void Release();

 private:
  int fd_ = -1;
  bool another_ = false;
  std::string path_;
  std::string error_;
};
