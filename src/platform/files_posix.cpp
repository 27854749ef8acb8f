// Files and directories on POSIX.
#include <dirent.h>
#include <fcntl.h>
#include <pwd.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>

#include "platform/files.h"

namespace {

bool WriteAll(int fd, const std::string& data) {
  std::size_t done = 0;
  while (done < data.size()) {
    const ssize_t n = write(fd, data.data() + done, data.size() - done);
    if (n < 0) {
      if (errno == EINTR) continue;
      return false;
    }
    done += static_cast<std::size_t>(n);
  }
  return true;
}

}  // namespace

bool PathExists(const std::string& path) {
  struct stat st;
  return lstat(path.c_str(), &st) == 0 || stat(path.c_str(), &st) == 0;
}

bool IsRegularFile(const std::string& path, bool executable) {
  struct stat st;
  if (stat(path.c_str(), &st) != 0 || !S_ISREG(st.st_mode)) return false;
  return !executable || access(path.c_str(), X_OK) == 0;
}

bool IsDirectory(const std::string& path) {
  struct stat st;
  return stat(path.c_str(), &st) == 0 && S_ISDIR(st.st_mode);
}

bool StampOf(const std::string& path, FileStamp& stamp) {
  struct stat st;
  if (stat(path.c_str(), &st) != 0) return false;
  stamp.size = static_cast<std::int64_t>(st.st_size);
  stamp.mtimeNs = static_cast<std::int64_t>(st.st_mtim.tv_sec) * 1000000000LL + st.st_mtim.tv_nsec;
  stamp.device = static_cast<std::uint64_t>(st.st_dev);
  stamp.inode = static_cast<std::uint64_t>(st.st_ino);
  stamp.regular = S_ISREG(st.st_mode);
  stamp.directory = S_ISDIR(st.st_mode);
  return true;
}

bool MakeDirectory(const std::string& path) {
  if (mkdir(path.c_str(), 0755) == 0) return true;
  // Someone else may have made it meanwhile; that is just as good.
  return errno == EEXIST && IsDirectory(path);
}

bool ListDirectory(const std::string& path, std::vector<DirectoryEntry>& entries) {
  entries.clear();
  DIR* handle = opendir(path.c_str());
  if (handle == nullptr) return false;
  while (dirent* entry = readdir(handle)) {
    if (std::strcmp(entry->d_name, ".") == 0 || std::strcmp(entry->d_name, "..") == 0) continue;
    DirectoryEntry e;
    e.name = entry->d_name;
    e.directory = entry->d_type == DT_DIR;
    e.regular = entry->d_type == DT_REG;
    if (entry->d_type == DT_LNK || entry->d_type == DT_UNKNOWN) {
      struct stat st;
      const std::string full = path + (path.empty() || path.back() == '/' ? "" : "/") + e.name;
      if (stat(full.c_str(), &st) != 0) continue;
      e.directory = S_ISDIR(st.st_mode);
      e.regular = S_ISREG(st.st_mode);
    }
    entries.push_back(std::move(e));
  }
  closedir(handle);
  return true;
}

bool ReadWholeFile(const std::string& path, std::string& text, std::size_t limit) {
  const int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC);
  if (fd < 0) return false;
  text.clear();
  char chunk[65536];
  bool ok = true;
  while (text.size() < limit) {
    const ssize_t n = read(fd, chunk, sizeof chunk);
    if (n < 0 && errno == EINTR) continue;
    if (n < 0) ok = false;
    if (n <= 0) break;
    text.append(chunk, static_cast<std::size_t>(n));
  }
  close(fd);
  if (text.size() > limit) text.resize(limit);
  return ok;
}

bool AppendToFile(const std::string& path, const std::string& data) {
  const int fd = open(path.c_str(), O_WRONLY | O_APPEND | O_CREAT | O_CLOEXEC, 0644);
  if (fd < 0) return false;
  const bool ok = WriteAll(fd, data);
  return close(fd) == 0 && ok;
}

void WriteToStandardError(const std::string& data) { WriteAll(STDERR_FILENO, data); }

bool ReplaceFile(const std::string& path, const std::string& data, unsigned mode) {
  const std::string temp = path + ".tmp" + std::to_string(static_cast<long>(getpid()));
  const int fd = open(temp.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, mode);
  if (fd < 0) return false;
  bool ok = WriteAll(fd, data);
  ok = (close(fd) == 0) && ok;
  if (!ok || rename(temp.c_str(), path.c_str()) != 0) {
    unlink(temp.c_str());
    return false;
  }
  return true;
}

bool RenameFile(const std::string& from, const std::string& to) {
  return rename(from.c_str(), to.c_str()) == 0;
}

bool RemoveFile(const std::string& path) { return unlink(path.c_str()) == 0; }

std::string HomeDirectory() {
  const char* home = std::getenv("HOME");
  if (home != nullptr && *home != '\0') return home;
  if (const passwd* pw = getpwuid(getuid())) {
    if (pw->pw_dir && *pw->pw_dir) return pw->pw_dir;
  }
  return "/tmp";
}

std::string UserName() {
  const passwd* pw = getpwuid(getuid());
  return pw != nullptr && pw->pw_name != nullptr ? pw->pw_name : "";
}

RandomAccessFile::~RandomAccessFile() { Close(); }

bool RandomAccessFile::Open(const std::string& path) {
  Close();
  file_ = std::fopen(path.c_str(), "rb");
  if (file_ == nullptr) return false;
  if (fseeko(file_, 0, SEEK_END) != 0 || (size_ = ftello(file_)) < 0) {
    Close();
    return false;
  }
  return true;
}

void RandomAccessFile::OpenMemory(std::vector<unsigned char> bytes) {
  Close();
  bytes_ = std::move(bytes);
  size_ = static_cast<std::int64_t>(bytes_.size());
  memory_ = true;
}

void RandomAccessFile::Close() {
  if (file_ != nullptr) std::fclose(file_);
  file_ = nullptr;
  memory_ = false;
  bytes_.clear();
  bytes_.shrink_to_fit();
  size_ = 0;
}

bool RandomAccessFile::ReadAt(std::int64_t offset, void* buffer, std::size_t count) {
  if (!IsOpen() || offset < 0 || offset > size_ ||
      static_cast<std::int64_t>(count) > size_ - offset)
    return false;
  if (memory_) {
    if (count > 0) std::memcpy(buffer, bytes_.data() + offset, count);
    return true;
  }
  if (fseeko(file_, offset, SEEK_SET) != 0) return false;
  return std::fread(buffer, 1, count, file_) == count;
}
