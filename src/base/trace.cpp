// The program's free-form trace.
#include "base/trace.h"

#include <algorithm>
#include <cstring>
#include <string>

#include "trovlib/trovlib.h"

namespace {

constexpr std::size_t kTraceLimit = 511;  // characters, without the NUL

bool StartsWith(const char* text, const char* word) {
  return std::strncmp(text, word, std::strlen(word)) == 0;
}

}  // namespace

int TraceLevelOf(const char* message) {
  if (message == nullptr) return 1;
  if (StartsWith(message, "Run") || StartsWith(message, "Open") || StartsWith(message, "Launch"))
    return 2;
  if (std::strstr(message, "WARNING") != nullptr) return 3;
  if (std::strstr(message, "ERROR") != nullptr) return 4;
  return 1;
}

void TraceMessage(const char* text, const char* argument) {
  std::string message(text ? text : "");
  if (message.size() > kTraceLimit) message.resize(kTraceLimit);
  if (argument != nullptr)
    message.append(argument, std::min(std::strlen(argument), kTraceLimit - message.size()));
  TrovMessage("Docuvane: ", message.c_str(), TraceLevelOf(message.c_str()));
}
