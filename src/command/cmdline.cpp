// Joining the command line and running a command on the help panel.
#include <climits>
#include <cstring>
#include <cwchar>
#include <string>

#include "base/settings.h"
#include "base/trace.h"
#include "catalogue/documents.h"
#include "catalogue/keywords.h"
#include "command/command.h"
#include "text/text.h"
#include "trovlib/trovlib.h"

namespace {

// The joined line is handed around as a C string of at most this many
// characters (the original buffer held 1024 bytes with its terminator).
constexpr std::size_t kCommandLineLimit = 1023;

std::string g_commandLine;
std::string g_topicBuffer;

// One argument in the current locale's encoding.  A character the locale
// cannot express becomes '?', so one odd character never loses the rest.
std::string NarrowArgument(const wchar_t* wide) {
  std::string narrow;
  if (wide == nullptr) return narrow;
  std::mbstate_t state{};
  char bytes[MB_LEN_MAX];
  for (const wchar_t* p = wide; *p != L'\0'; ++p) {
    const std::size_t n = std::wcrtomb(bytes, *p, &state);
    if (n == static_cast<std::size_t>(-1)) {
      narrow.push_back('?');
      state = std::mbstate_t{};
    } else {
      narrow.append(bytes, n);
    }
  }
  return narrow;
}

}  // namespace

const char* Command_Line(int argc, const wchar_t* const* argv) {
  std::string line;
  for (int i = 1; i < argc && argv != nullptr; ++i) {
    if (i > 1) line.push_back(' ');
    const wchar_t* argument = argv[i] ? argv[i] : L"";
    const bool quoted = std::wcschr(argument, L' ') != nullptr;
    if (quoted) line.push_back('"');
    line += NarrowArgument(argument);
    if (quoted) line.push_back('"');
  }

  // An over-long line is cut rather than refused: the start of a command
  // (the marks and the word) is what matters, and a cut word still finds
  // its place in the list.
  if (line.size() > kCommandLineLimit) {
    const std::string note = "command line of " + std::to_string(line.size()) +
                             " characters cut to " + std::to_string(kCommandLineLimit);
    TrovMessage("WARNING: Command_Line ", note.c_str(), 4);
    line.resize(Utf8CutLength(line, kCommandLineLimit));
  }

  g_commandLine = line;
  TrovMessage("INFO: Command_Line - ", g_commandLine.c_str(), 2);
  return g_commandLine.c_str();
}

namespace {

// The first-registered target of a dotted keyword topic, or NULL.
const KeywordTarget* KeywordTopicTarget(const char* body) {
  const KeywordNode* node = FindKeyword(body);
  const KeywordTarget* target = node != nullptr ? node->Targets : nullptr;
  if (target == nullptr) return nullptr;
  while (target->Next != nullptr) target = target->Next;  // newest first: the last is the oldest
  return target;
}

}  // namespace

int ProcessCommand(CommandPanel& panel, const char* command, int exact) {
  if (TraceMode != 0) TraceMessage("Received Command: ", command);
  if (command == nullptr || *command == '\0') return 1;

  const char* body = command;
  if (*body == '?') ++body;
  TraceMessage("Search Keyword: ", body);
  if (*body == '#') ++body;

  if (*body == '.') {
    if (const KeywordTarget* target = KeywordTopicTarget(body)) {
      const int index = target->DocumentIndex;
      if (index >= 0 && index < DocumentCount && index < kMaxDocuments) {
        panel.OpenDocument(DocumentTable[index].Path.c_str(), target->Anchor ? target->Anchor : "");
        return 1;
      }
      TrovMessage("ERROR: ProcessCommand ",
                  ("keyword topic names no document: " + std::string(body)).c_str(), 5);
    }
  }

  if (panel.HasSearchControl()) panel.SetSearchValue(body);

  // The word is copied out of the list before it is shown: a nested command
  // while the topic is shown may overwrite the shared buffer.
  std::string topic(body);
  if (panel.HasWordList()) {
    const int row = panel.FindWord(body, exact);
    if (row >= 0) {
      panel.SelectWord(row);
      g_topicBuffer = panel.GetWord(row);
      topic = g_topicBuffer;
    }
  }

  panel.ShowTopic(topic.c_str(), 1);
  return 1;
}
