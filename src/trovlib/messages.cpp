// TrovMessage: standard error, the TROVLIB_LOG file and the in-process sink.
#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <mutex>
#include <string>

#include "trovlib/trovlib.h"

namespace {

constexpr int kDefaultStderrLevel = 4;

std::mutex& SinkMutex() {
  static std::mutex mutex;
  return mutex;
}

TrovMessageSink& Sink() {
  static TrovMessageSink sink;
  return sink;
}

int StderrLevel() {
  const char* text = std::getenv("TROVLIB_STDERR_LEVEL");
  if (text == nullptr || *text == '\0') return kDefaultStderrLevel;
  char* end = nullptr;
  long level = std::strtol(text, &end, 10);
  if (end == text || level < -1000000 || level > 1000000) return kDefaultStderrLevel;
  return static_cast<int>(level);
}

// Writes all of `data` with as few calls as the kernel allows.  For the log
// this is one write() on an O_APPEND descriptor, so lines of several
// processes never interleave.
void WriteAll(int fd, const std::string& data) {
  std::size_t done = 0;
  while (done < data.size()) {
    ssize_t n = write(fd, data.data() + done, data.size() - done);
    if (n < 0) {
      if (errno == EINTR) continue;
      return;
    }
    done += static_cast<std::size_t>(n);
  }
}

// A message is one line wherever it is written: a text that carries its own
// line breaks (a forwarded command, a file's contents) must not split it.
std::string OneLine(const char* prefix, const char* text) {
  std::string line = std::string(prefix) + text;
  for (char& c : line)
    if (c == '\n' || c == '\r') c = ' ';
  return line;
}

}  // namespace

void TrovMessage(const char* prefix, const char* text, int level) {
  if (prefix == nullptr) prefix = "";
  if (text == nullptr) text = "";
  const std::string line = OneLine(prefix, text);

  if (level >= StderrLevel()) WriteAll(STDERR_FILENO, line + "\n");

  const char* log = std::getenv("TROVLIB_LOG");
  if (log != nullptr && *log != '\0') {
    int fd = open(log, O_WRONLY | O_APPEND | O_CREAT | O_CLOEXEC, 0644);
    if (fd >= 0) {
      WriteAll(fd, std::to_string(level) + "\t" + line + "\n");
      close(fd);
    }
  }

  TrovMessageSink sink;
  {
    std::lock_guard<std::mutex> lock(SinkMutex());
    sink = Sink();
  }
  // Called outside the lock, so that a sink may itself report.
  if (sink) sink(prefix, text, level);
}

void TrovSetMessageSink(TrovMessageSink sink) {
  std::lock_guard<std::mutex> lock(SinkMutex());
  Sink() = std::move(sink);
}
