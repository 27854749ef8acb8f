// A file written beside its final place and moved there only when it is
// done.  Its writer holds a lock on it for as long as it writes, so that a
// later writer can tell a file in progress from one left behind by a
// process that was killed.
#pragma once

#include <cstddef>
#include <string>

class PartFile {
 public:
  PartFile() = default;
  ~PartFile();  // removes the file unless it was moved into place
  PartFile(const PartFile&) = delete;
  PartFile& operator=(const PartFile&) = delete;

  // Creates and locks `target` + ".part-XXXXXX" (mode 0644).
  bool Create(const std::string& target);
  bool IsOpen() const { return fd_ >= 0; }
  const std::string& path() const { return path_; }
  bool Write(const char* data, std::size_t size);
  // Renames the file to `target`, still under its lock; false leaves it.
  bool MoveTo(const std::string& target);
  void Remove();

 private:
  int fd_ = -1;
  std::string path_;
};

// Removes the files `target` + ".part-XXXXXX" whose writer is gone (nobody
// holds their lock).  Files that cannot be locked at all stay.  Returns how
// many were removed.
int RemoveAbandonedPartFiles(const std::string& target);
