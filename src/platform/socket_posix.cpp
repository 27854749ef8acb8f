// Unix-domain stream sockets.
#include "platform/socket_posix.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstring>

namespace {

bool AddressOf(const std::string& path, sockaddr_un* address, std::string* error) {
  if (path.empty() || path.size() > kMaxSocketPath) {
    if (error != nullptr) *error = "socket path of " + std::to_string(path.size()) + " bytes";
    return false;
  }
  std::memset(address, 0, sizeof *address);
  address->sun_family = AF_UNIX;
  std::memcpy(address->sun_path, path.c_str(), path.size() + 1);
  return true;
}

void Fail(std::string* error, const std::string& what) {
  if (error != nullptr) *error = what + ": " + std::strerror(errno);
}

}  // namespace

bool SocketFileIdOf(const std::string& path, SocketFileId* id) {
  struct stat st;
  if (lstat(path.c_str(), &st) != 0) return false;
  id->device = st.st_dev;
  id->inode = st.st_ino;
  return true;
}

int ListenAt(const std::string& path, std::string* error) {
  sockaddr_un address;
  if (!AddressOf(path, &address, error)) return -1;
  if (unlink(path.c_str()) != 0 && errno != ENOENT) {
    Fail(error, path);
    return -1;
  }
  const int fd = socket(AF_UNIX, SOCK_STREAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0);
  if (fd < 0) {
    Fail(error, "socket");
    return -1;
  }
  // The file is private from its first moment, not only after chmod.
  const mode_t mask = umask(077);
  const bool bound = bind(fd, reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0;
  umask(mask);
  if (!bound || chmod(path.c_str(), 0600) != 0 || listen(fd, 64) != 0) {
    Fail(error, path);
    close(fd);
    return -1;
  }
  return fd;
}

int AcceptWaiting(int listener) {
  for (;;) {
    const int fd = accept4(listener, nullptr, nullptr, SOCK_NONBLOCK | SOCK_CLOEXEC);
    if (fd >= 0 || errno != EINTR) return fd;
  }
}

bool PeerUserId(int fd, unsigned* uid) {
  ucred credentials{};
  socklen_t length = sizeof credentials;
  if (getsockopt(fd, SOL_SOCKET, SO_PEERCRED, &credentials, &length) != 0) return false;
  *uid = credentials.uid;
  return true;
}

unsigned CurrentUserId() { return geteuid(); }

long ReadArrived(int fd, char* buffer, std::size_t size) {
  for (;;) {
    const ssize_t got = recv(fd, buffer, size, MSG_DONTWAIT);
    if (got >= 0) return static_cast<long>(got);
    if (errno == EINTR) continue;
    return errno == EAGAIN || errno == EWOULDBLOCK ? -1 : -2;
  }
}

bool WriteAll(int fd, const std::string& bytes, int timeoutMs) {
  using Clock = std::chrono::steady_clock;
  const auto deadline = Clock::now() + std::chrono::milliseconds(timeoutMs);
  std::size_t done = 0;
  while (done < bytes.size()) {
    const ssize_t put =
        send(fd, bytes.data() + done, bytes.size() - done, MSG_DONTWAIT | MSG_NOSIGNAL);
    if (put > 0) {
      done += static_cast<std::size_t>(put);
      continue;
    }
    if (put < 0 && errno == EINTR) continue;
    if (put < 0 && errno != EAGAIN && errno != EWOULDBLOCK) return false;
    const auto left =
        std::chrono::duration_cast<std::chrono::milliseconds>(deadline - Clock::now()).count();
    if (left <= 0) return false;
    pollfd p{fd, POLLOUT, 0};
    if (poll(&p, 1, static_cast<int>(left)) < 0 && errno != EINTR) return false;
  }
  return true;
}

int ConnectTo(const std::string& path, bool* refused, std::string* error) {
  *refused = false;
  sockaddr_un address;
  if (!AddressOf(path, &address, error)) return -1;
  const int fd = socket(AF_UNIX, SOCK_STREAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0);
  if (fd < 0) {
    Fail(error, "socket");
    return -1;
  }
  int rc;
  do {
    rc = connect(fd, reinterpret_cast<const sockaddr*>(&address), sizeof address);
  } while (rc != 0 && errno == EINTR);
  if (rc != 0) {
    // A non-blocking Unix-domain connect never completes later: EAGAIN
    // means the listen queue is full.
    *refused = errno == ECONNREFUSED || errno == EAGAIN || errno == ENOENT;
    Fail(error, path);
    close(fd);
    return -1;
  }
  return fd;
}

int WaitReadable(int fd, int timeoutMs) {
  pollfd p{fd, POLLIN, 0};
  int rc;
  do {
    rc = poll(&p, 1, timeoutMs);
  } while (rc < 0 && errno == EINTR);
  return rc < 0 ? -1 : rc > 0 ? 1 : 0;
}

void EndSending(int fd) { shutdown(fd, SHUT_WR); }

void CloseSocket(int fd) {
  if (fd >= 0) close(fd);
}
