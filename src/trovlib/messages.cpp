// TrovMessage: standard error, the TROVLIB_LOG file and the in-process sink.
#include <cstdlib>
#include <mutex>
#include <string>
#include <vector>

#include "platform/files.h"
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

thread_local std::vector<TrovHeldMessage>* t_held = nullptr;

int StderrLevel() {
  const char* text = std::getenv("TROVLIB_STDERR_LEVEL");
  if (text == nullptr || *text == '\0') return kDefaultStderrLevel;
  char* end = nullptr;
  long level = std::strtol(text, &end, 10);
  if (end == text || level < -1000000 || level > 1000000) return kDefaultStderrLevel;
  return static_cast<int>(level);
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
  if (t_held != nullptr) {
    t_held->push_back(TrovHeldMessage{prefix, text, level});
    return;
  }
  const std::string line = OneLine(prefix, text);

  if (level >= StderrLevel()) WriteToStandardError(line + "\n");

  const char* log = std::getenv("TROVLIB_LOG");
  if (log != nullptr && *log != '\0') {
    // One write on an appending file, so that lines of several processes
    // never interleave.
    AppendToFile(log, std::to_string(level) + "\t" + line + "\n");
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

void TrovHoldMessages(std::vector<TrovHeldMessage>* held) { t_held = held; }

void TrovReplayMessages(const std::vector<TrovHeldMessage>& held) {
  for (const TrovHeldMessage& m : held) TrovMessage(m.prefix.c_str(), m.text.c_str(), m.level);
}
