// Commands, environments and index entry heads in extracted text.
#include "scan/words.h"

#include <cstring>

namespace {

bool IsLetter(char c) { return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z'); }
bool IsDigit(char c) { return c >= '0' && c <= '9'; }
bool IsCommandChar(char c) { return IsLetter(c) || c == '@' || c == '_' || c == ':'; }

// Length of a backslash at `at` (1, or 3 for U+2216 and U+29F5), 0 if none.
std::size_t BackslashAt(const std::string& text, std::size_t at) {
  if (text[at] == '\\') return 1;
  if (at + 2 < text.size() && static_cast<unsigned char>(text[at]) == 0xE2) {
    const unsigned char b1 = static_cast<unsigned char>(text[at + 1]);
    const unsigned char b2 = static_cast<unsigned char>(text[at + 2]);
    if ((b1 == 0x88 && b2 == 0x96) || (b1 == 0xA7 && b2 == 0xB5)) return 3;
  }
  return 0;
}

// The command whose backslash is at `at`; `end` is set after it.  A
// trailing ':' or '_' belongs to the sentence ("use \section: ..."), not
// to the command, unless letters follow it.
std::string CommandAt(const std::string& text, std::size_t at, std::size_t& end) {
  const std::size_t slash = BackslashAt(text, at);
  std::size_t i = at + slash;
  if (i >= text.size() || !IsLetter(text[i])) {
    end = at + (slash ? slash : 1);
    return std::string();
  }
  while (i < text.size() && IsCommandChar(text[i])) ++i;
  std::size_t stop = i;
  while (stop > at + slash && (text[stop - 1] == ':' || text[stop - 1] == '_')) --stop;
  end = i;
  return "\\" + text.substr(at + slash, stop - at - slash);
}

std::string Trim(const std::string& s) {
  std::size_t b = 0, e = s.size();
  while (b < e && (s[b] == ' ' || s[b] == '\t')) ++b;
  while (e > b && (s[e - 1] == ' ' || s[e - 1] == '\t')) --e;
  return s.substr(b, e - b);
}

bool IsEnvironmentName(const std::string& name) {
  if (name.empty() || name.size() > 40) return false;
  for (char c : name)
    if (!IsLetter(c) && c != '*' && c != '@' && c != '-' && !IsDigit(c)) return false;
  return IsLetter(name[0]);
}

bool IsPackageName(const std::string& name) {
  if (name.empty() || name.size() > 40 || !IsLetter(name[0])) return false;
  for (char c : name)
    if (!IsLetter(c) && !IsDigit(c) && c != '-' && c != '_') return false;
  return true;
}

// True when an argument with a meta-variable follows at `at`: blanks, an
// optional star and blanks, then "{⟨" or "[⟨" (U+27E8).
bool MetaArgumentAt(const std::string& text, std::size_t at) {
  while (at < text.size() && text[at] == ' ') ++at;
  if (at < text.size() && text[at] == '*') ++at;
  while (at < text.size() && text[at] == ' ') ++at;
  if (at >= text.size() || (text[at] != '{' && text[at] != '[')) return false;
  return text.compare(at + 1, 3, "\xE2\x9F\xA8") == 0;
}

}  // namespace

std::vector<std::string> WordsOfText(const std::string& text, std::vector<bool>* described) {
  std::vector<std::string> words;
  if (described) described->clear();
  std::size_t i = 0;
  while (i < text.size()) {
    if (!BackslashAt(text, i)) {
      ++i;
      continue;
    }
    std::size_t end = i;
    std::string command = CommandAt(text, i, end);
    i = end;
    if (command.size() < 2) continue;
    if (command == "\\begin") {
      std::size_t j = i;
      while (j < text.size() && text[j] == ' ') ++j;
      if (j < text.size() && text[j] == '{') {
        const std::size_t close = text.find('}', j + 1);
        if (close != std::string::npos) {
          const std::string name = text.substr(j + 1, close - j - 1);
          if (IsEnvironmentName(name)) {
            words.push_back("{" + name + "}");
            if (described) described->push_back(false);
            i = close + 1;
            continue;
          }
        }
      }
    }
    words.push_back(command);
    if (described) described->push_back(MetaArgumentAt(text, i));
  }
  return words;
}

std::string IndexEntryHead(const std::string& lineStart) {
  const std::string line = Trim(lineStart);
  if (line.empty()) return std::string();
  std::string head, rest;
  if (BackslashAt(line, 0)) {
    std::size_t end = 0;
    head = CommandAt(line, 0, end);
    if (head.size() < 2) return std::string();
    rest = line.substr(end);
  } else if (line[0] == '{') {
    const std::size_t close = line.find('}');
    if (close == std::string::npos || !IsEnvironmentName(line.substr(1, close - 1)))
      return std::string();
    head = line.substr(0, close + 1);
    rest = line.substr(close + 1);
  } else {
    // "align (environment)", "align environment", "geometry (package)".
    std::size_t end = 0;
    while (end < line.size() && line[end] != ' ' && line[end] != ',') ++end;
    const std::string name = line.substr(0, end);
    std::string tail = Trim(line.substr(end));
    const char* kinds[] = {"(environment)", "environment", "(env.)", "(package)",
                           "package",       "(class)",     "class"};
    std::string kind;
    for (const char* k : kinds)
      if (tail.compare(0, std::strlen(k), k) == 0) {
        kind = k;
        break;
      }
    if (kind.empty()) return std::string();
    const bool environment = kind.find("env") != std::string::npos;
    if (environment ? !IsEnvironmentName(name) : !IsPackageName(name)) return std::string();
    head = environment ? "{" + name + "}" : name;
    rest = tail.substr(kind.size());
  }
  // What may follow the head: a kind in parentheses, then the page list.
  rest = Trim(rest);
  if (!rest.empty() && rest[0] == '(') {
    const std::size_t close = rest.find(')');
    if (close == std::string::npos) return std::string();
    rest = rest.substr(close + 1);
  }
  return IsPageListFiller(rest) ? head : std::string();
}

bool IsPageListFiller(const std::string& text) {
  for (std::size_t i = 0; i < text.size(); ++i) {
    const char c = text[i];
    if (c == ' ' || c == '.' || c == ',' || c == '-' || c == '\t' || IsDigit(c)) continue;
    // En dash, em dash, the middle dot and the ellipsis of leaders.
    if (static_cast<unsigned char>(c) == 0xE2 && i + 2 < text.size()) {
      i += 2;
      continue;
    }
    if (static_cast<unsigned char>(c) == 0xC2 && i + 1 < text.size()) {
      ++i;
      continue;
    }
    return false;
  }
  return true;
}

bool IsUsableWord(const std::string& word) { return word.size() >= 2 && word.size() <= 60; }
