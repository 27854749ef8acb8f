// Unix-domain stream sockets as the command channel uses them.  Every call
// that may wait takes a bound; nothing here reports: failures come back as
// results with the reason in `error`.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

// Longest socket path the kernel takes (sun_path less its NUL).  Longer
// paths would be cut, or become an abstract socket that every local user
// can reach, so they are refused.
constexpr std::size_t kMaxSocketPath = 107;

// What identifies the file at a path (links not followed).
struct SocketFileId {
  std::uint64_t device = 0;
  std::uint64_t inode = 0;
  bool operator==(const SocketFileId& o) const { return device == o.device && inode == o.inode; }
};
// False when nothing stands at `path`.
bool SocketFileIdOf(const std::string& path, SocketFileId* id);

// A non-blocking listening socket at `path`, mode 0600.  Whatever stands at
// the path is removed first: only the holder of the instance lock may call
// this.  -1 on failure.
int ListenAt(const std::string& path, std::string* error);

// One waiting connection of a listening socket, non-blocking; -1 when none.
int AcceptWaiting(int listener);

// The user id of the process at the other end; false when it is unknown.
bool PeerUserId(int fd, unsigned* uid);
unsigned CurrentUserId();

// Bytes that have arrived, at most `size`: their count, 0 when the peer has
// closed, -1 when nothing is there yet, -2 on a failure.
long ReadArrived(int fd, char* buffer, std::size_t size);

// Writes all of `bytes` within `timeoutMs`; false when the peer is gone or
// does not take them in time.
bool WriteAll(int fd, const std::string& bytes, int timeoutMs);

// A connected, non-blocking socket to `path`, or -1 with the reason
// (`refused` is set when nobody takes connections there, or its queue is
// full: a starting or ending instance).
int ConnectTo(const std::string& path, bool* refused, std::string* error);

// Waits until `fd` has bytes or an end to read: 1, 0 on time-out, -1 failure.
int WaitReadable(int fd, int timeoutMs);

// Ends sending on `fd` (the peer reads an end), keeps it open for reading.
void EndSending(int fd);
void CloseSocket(int fd);
