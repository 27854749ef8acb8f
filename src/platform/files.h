// Files and directories as the operating system gives them.  Every call of
// the program on the file system goes through here.
#pragma once

#include <cstdint>
#include <cstdio>
#include <string>
#include <vector>

// True when something (file, directory, link) stands at `path`.
bool PathExists(const std::string& path);
// True for a regular file (links followed); with `executable`, one this
// user may run.
bool IsRegularFile(const std::string& path, bool executable = false);
bool IsDirectory(const std::string& path);

// What identifies one version of a file: size, modification time, file id.
struct FileStamp {
  std::int64_t size = -1;
  std::int64_t mtimeNs = 0;
  std::uint64_t device = 0;
  std::uint64_t inode = 0;
  bool regular = false;
  bool directory = false;
  bool operator==(const FileStamp& o) const {
    return size == o.size && mtimeNs == o.mtimeNs && device == o.device && inode == o.inode;
  }
};
// False when the path cannot be examined.
bool StampOf(const std::string& path, FileStamp& stamp);

// Creates one directory (mode 0755); true when it exists afterwards.
bool MakeDirectory(const std::string& path);

// One directory's entries ("." and ".." left out), each with whether it is
// a directory and whether it is a regular file (links followed).
struct DirectoryEntry {
  std::string name;
  bool directory = false;
  bool regular = false;
};
bool ListDirectory(const std::string& path, std::vector<DirectoryEntry>& entries);

// The whole file, at most `limit` bytes of it.
bool ReadWholeFile(const std::string& path, std::string& text, std::size_t limit);

// Appends `data` to the file (created with mode 0644) in one write, so
// that lines of several processes never interleave.
bool AppendToFile(const std::string& path, const std::string& data);
// Writes `data` to standard error.
void WriteToStandardError(const std::string& data);

// Writes `data` to `path` through a temporary file beside it and a rename,
// so that a reader never sees half of it.  Mode 0600 unless `mode` says.
bool ReplaceFile(const std::string& path, const std::string& data, unsigned mode = 0600);

bool RenameFile(const std::string& from, const std::string& to);
bool RemoveFile(const std::string& path);

// The user's home directory ($HOME, else the password database, else /tmp).
std::string HomeDirectory();

// The user's login name from the password database, or "".
std::string UserName();

// Random access to a file held open, or to bytes held in memory.
class RandomAccessFile {
 public:
  RandomAccessFile() = default;
  ~RandomAccessFile();
  RandomAccessFile(const RandomAccessFile&) = delete;
  RandomAccessFile& operator=(const RandomAccessFile&) = delete;

  bool Open(const std::string& path);
  void OpenMemory(std::vector<unsigned char> bytes);
  void Close();
  bool IsOpen() const { return file_ != nullptr || memory_; }
  std::int64_t Size() const { return size_; }
  // Exactly `count` bytes at `offset`, or false (nothing read).
  bool ReadAt(std::int64_t offset, void* buffer, std::size_t count);

 private:
  std::FILE* file_ = nullptr;
  bool memory_ = false;
  std::vector<unsigned char> bytes_;
  std::int64_t size_ = 0;
};
