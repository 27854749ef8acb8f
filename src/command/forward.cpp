#include "command/forward.h"

#include <chrono>
#include <cstdlib>
#include <cwchar>
#include <thread>

#include "command/channel_names.h"
#include "command/wire.h"
#include "platform/files.h"
#include "platform/socket_posix.h"
#include "trovlib/trovlib.h"

namespace {

using Clock = std::chrono::steady_clock;
using std::chrono::milliseconds;

// A start that meets an instance still building its window finds no socket
// yet; a start that meets a full listen queue (many starts at once on a busy
// machine) is refused for a while.  Both try again after a short pause,
// within this bound.  (A socket left by a dead instance is no reason to
// stop early: the lock is free then, and the start becomes the instance.)
constexpr milliseconds kRetryPause(100);
constexpr milliseconds kConnectBudget(8000);
// Longest wait for any one answer of the server.  It answers at once when
// idle; dozens of starts at once on a busy machine queue up behind each
// other for a few seconds; longer means it is stuck.
constexpr int kAnswerMs = 5000;
// The framework's code for UTF-8 text, the format its Execute(text) uses.
constexpr unsigned char kUtf8Text = 17;

void Message(const char* prefix, const char* text, int level = 2) {
  TrovMessage(prefix, text, level);
}

std::string Code(unsigned char code) { return std::string(1, static_cast<char>(code)); }

void AppendUtf8(std::string& out, unsigned long c) {
  if (c < 0x80) {
    out += static_cast<char>(c);
  } else if (c < 0x800) {
    out += static_cast<char>(0xC0 | (c >> 6));
    out += static_cast<char>(0x80 | (c & 0x3F));
  } else if (c < 0x10000) {
    out += static_cast<char>(0xE0 | (c >> 12));
    out += static_cast<char>(0x80 | ((c >> 6) & 0x3F));
    out += static_cast<char>(0x80 | (c & 0x3F));
  } else {
    out += static_cast<char>(0xF0 | (c >> 18));
    out += static_cast<char>(0x80 | ((c >> 12) & 0x3F));
    out += static_cast<char>(0x80 | ((c >> 6) & 0x3F));
    out += static_cast<char>(0x80 | (c & 0x3F));
  }
}

// The command as the window shows text: read in the user's locale, or
// byte for byte as Latin-1 where the locale cannot read it; sent as UTF-8.
std::string Utf8Text(const std::string& text) {
  std::string out;
  std::mbstate_t state{};
  const char* from = text.c_str();
  std::wstring wide(text.size() + 1, L'\0');
  const std::size_t n = std::mbsrtowcs(&wide[0], &from, wide.size(), &state);
  if (n != static_cast<std::size_t>(-1) && (n != 0 || text.empty())) {
    for (std::size_t i = 0; i < n; ++i) AppendUtf8(out, static_cast<unsigned long>(wide[i]));
  } else {
    for (unsigned char c : text) AppendUtf8(out, c);
  }
  return out;
}

// One conversation on its socket.
class Conversation {
 public:
  ~Conversation() { CloseSocket(fd_); }

  enum class Open { kOpened, kNoServer, kRefused, kNoAnswer };
  Open Start(const std::string& path) {
    bool refused = false;
    std::string error;
    fd_ = ConnectTo(path, &refused, &error);
    if (fd_ < 0) return refused ? Open::kNoServer : Open::kNoAnswer;
    if (!Send(Code(wire::kConnect) + wire::Name(kCommandTopic))) return Open::kNoAnswer;
    const int answer = Answer();
    if (answer == wire::kConnect) return Open::kOpened;
    return answer == wire::kFail ? Open::kRefused : Open::kNoAnswer;
  }

  bool Send(const std::string& message) { return fd_ >= 0 && WriteAll(fd_, message, kAnswerMs); }

  // The server reads a conversation in order and closes it at its end
  // message, after answering a failure of anything before: an end with no
  // failure means all of it was taken.
  bool Finish() {
    if (!Send(Code(wire::kDisconnect))) return false;
    EndSending(fd_);
    const auto deadline = Clock::now() + milliseconds(kAnswerMs);
    for (bool failed = false;;) {
      const auto left = std::chrono::duration_cast<milliseconds>(deadline - Clock::now()).count();
      if (left <= 0 || WaitReadable(fd_, static_cast<int>(left)) != 1) return false;
      char buffer[64];
      const long got = ReadArrived(fd_, buffer, sizeof buffer);
      if (got == 0) return !failed;
      if (got == -2) return false;
      for (long i = 0; i < got; ++i) failed = failed || buffer[i] == static_cast<char>(wire::kFail);
    }
  }

 private:
  // The code of the server's answer to the last message, -1 when none came.
  int Answer() {
    std::string arrived;
    const auto deadline = Clock::now() + milliseconds(kAnswerMs);
    for (;;) {
      std::size_t used = 0;
      wire::Message m;
      std::string error;
      if (!arrived.empty()) {
        const wire::Parse parse = wire::TakeMessage(arrived, true, &used, &m, &error);
        if (parse == wire::Parse::kBad) return -1;
        if (parse == wire::Parse::kComplete) return m.code;
      }
      const auto left = std::chrono::duration_cast<milliseconds>(deadline - Clock::now()).count();
      if (left <= 0 || WaitReadable(fd_, static_cast<int>(left)) != 1) return -1;
      char buffer[512];
      const long got = ReadArrived(fd_, buffer, sizeof buffer);
      if (got == 0 || got == -2) return -1;
      if (got > 0) arrived.append(buffer, static_cast<std::size_t>(got));
    }
  }

  int fd_ = -1;
};

// The conversation, tried again while a starting server is not there yet or
// its queue is full; never longer than the bound above.
bool Connect(Conversation& conversation, const std::string& path) {
  if (path.empty() || path.find('/') == std::string::npos || path.size() > kMaxSocketPath)
    return false;
  const auto giveUp = Clock::now() + kConnectBudget;
  for (;;) {
    if (PathExists(path)) {
      const Conversation::Open open = conversation.Start(path);
      if (open == Conversation::Open::kOpened) return true;
      // A server that took the connection but never answered is stuck:
      // asking again would only wait again.
      if (open == Conversation::Open::kNoAnswer) {
        Message("ERROR: DDE client ", "no answer from the server", 5);
        return false;
      }
      if (open == Conversation::Open::kRefused) return false;
    }
    if (Clock::now() + kRetryPause > giveUp) return false;
    std::this_thread::sleep_for(kRetryPause);
  }
}

}  // namespace

int ForwardCommand(const char* command, const std::string& socketPath, bool* delivered) {
  const char* text = command != nullptr ? command : "";
  if (delivered != nullptr) *delivered = false;
  Message("INFO: SendCommand ", text);
  Message("INFO: DDE client ", "is connecting...");
  Conversation conversation;
  const bool connected = Connect(conversation, socketPath);
  const std::string status = std::string("Client host=\"localhost\" port=\"") + kCommandService +
                             "\" topic=\"" + kCommandTopic + "\" " +
                             (connected ? "connected" : "failed to connect");
  Message("INFO: Connection ", status.c_str());
  if (!connected) return 0;

  Message("INFO: DDE client ", "Execute...");
  const std::string utf8 = Utf8Text(text);
  // The text with its terminator, as the framework sends it.
  const bool sent = utf8.size() + 1 <= wire::kMaxDataBytes &&
                    conversation.Send(Code(wire::kExecute) + Code(kUtf8Text) +
                                      wire::Data(utf8.c_str(), utf8.size() + 1));
  if (!sent) Message("ERROR: DDE client ", "Execute failed!", 5);
  // The end of the conversation comes back once the server has taken the
  // execute: only then is the command delivered.
  const bool taken = conversation.Finish();
  if (sent && !taken) Message("ERROR: DDE client ", "the server did not take the command", 5);
  if (delivered != nullptr) *delivered = sent && taken;
  Message("INFO: DDE client ", "disconnected from server");
  return 1;
}
