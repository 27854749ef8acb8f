// The command channel's messages.
#include "command/wire.h"

namespace wire {

namespace {

class Reader {
 public:
  explicit Reader(const std::string& bytes) : bytes_(bytes) {}

  bool Byte(unsigned char* b) {
    if (at_ + 1 > bytes_.size()) return false;
    *b = static_cast<unsigned char>(bytes_[at_++]);
    return true;
  }
  // A length and that many bytes; false while they have not all arrived.
  // A length over `bound` is refused at once.
  bool Counted(std::size_t bound, const char* what, std::string* out) {
    if (at_ + 4 > bytes_.size()) return false;
    std::uint32_t n = 0;
    for (int i = 0; i < 4; ++i)
      n |= static_cast<std::uint32_t>(static_cast<unsigned char>(bytes_[at_ + i])) << (8 * i);
    if (n > bound) {
      error_ = std::string(what) + " claims " + std::to_string(n) + " bytes, at most " +
               std::to_string(bound);
      return false;
    }
    if (at_ + 4 + n > bytes_.size()) return false;
    out->assign(bytes_, at_ + 4, n);
    at_ += 4 + n;
    return true;
  }
  std::size_t used() const { return at_; }
  const std::string& error() const { return error_; }

 private:
  const std::string& bytes_;
  std::size_t at_ = 0;
  std::string error_;
};

}  // namespace

std::string Length(std::size_t n) {
  std::string bytes;
  for (int i = 0; i < 4; ++i) bytes.push_back(static_cast<char>((n >> (8 * i)) & 0xFF));
  return bytes;
}

Parse TakeMessage(const std::string& bytes, bool fromServer, std::size_t* used, Message* message,
                  std::string* error) {
  Reader in(bytes);
  Message m;
  bool whole = in.Byte(&m.code);
  const auto name = [&] { return whole && (whole = in.Counted(kMaxNameBytes, "a name", &m.name)); };
  const auto format = [&] { return whole && (whole = in.Byte(&m.format)); };
  const auto data = [&] { return whole && (whole = in.Counted(kMaxDataBytes, "data", &m.data)); };
  if (whole) {
    switch (m.code) {
      case kExecute:
        format() && data();
        break;
      case kRequest:
        name() && format();
        break;
      case kPoke:
      case kAdvise:
        name() && format() && data();
        break;
      case kAdviseStart:
      case kAdviseStop:
        if (!fromServer) name();
        break;
      case kConnect:
        if (!fromServer) name();
        break;
      case kRequestReply:
        if (!fromServer) {
          *error = "unexpected message code 8";
          return Parse::kBad;
        }
        data();
        break;
      case kFail:
      case kDisconnect:
        break;
      default:
        *error = "unknown message code " + std::to_string(m.code);
        return Parse::kBad;
    }
  }
  if (!in.error().empty()) {
    *error = in.error();
    return Parse::kBad;
  }
  if (!whole) return Parse::kIncomplete;
  *used = in.used();
  *message = std::move(m);
  return Parse::kComplete;
}

}  // namespace wire
