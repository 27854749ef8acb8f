// The command channel's messages in the framework's IPC wire format: a code
// byte, then names (32-bit little-endian length and UTF-8 bytes), format
// bytes and data (32-bit length and bytes), as each code needs.  Every
// length is checked against its bound before anything is kept, so a
// message that claims more than it may carry is refused from its header.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

namespace wire {

enum Code : unsigned char {
  kExecute = 1,
  kRequest = 2,
  kPoke = 3,
  kAdviseStart = 4,
  kAdvise = 6,
  kAdviseStop = 7,
  kRequestReply = 8,
  kFail = 9,
  kConnect = 10,
  kDisconnect = 11,
};

// Topics and items ("CommandLine", "Date+len") are short.
constexpr std::size_t kMaxNameBytes = 256;
// Room for a command line (1023 bytes and its terminator) in every text
// format the framework sends, UTF-32 included.  Request replies, pokes and
// advice are smaller still.
constexpr std::size_t kMaxDataBytes = 4 * 1024;
// The longest message there can be.
constexpr std::size_t kMaxMessageBytes = 1 + 4 + kMaxNameBytes + 1 + 4 + kMaxDataBytes;

struct Message {
  unsigned char code = 0;
  std::string name;  // topic or item
  unsigned char format = 0;
  std::string data;
};

enum class Parse { kIncomplete, kComplete, kBad };

// Reads the first message of `bytes`.  `fromServer` selects the layouts a
// client receives (acknowledgements carry no name).  On kComplete, `used`
// is its length; on kBad, `error` says why.
Parse TakeMessage(const std::string& bytes, bool fromServer, std::size_t* used, Message* message,
                  std::string* error);

// Pieces of an outgoing message.
std::string Length(std::size_t n);
inline std::string Name(const std::string& s) { return Length(s.size()) + s; }
inline std::string Data(const void* data, std::size_t size) {
  return Length(size) + std::string(static_cast<const char*>(data), size);
}

}  // namespace wire
