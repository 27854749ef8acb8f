// Small rules on 8-bit strings that every part of the program shares.
#include "text/text.h"

std::string Folded(const std::string& text) {
  std::string folded(text);
  for (char& c : folded) c = static_cast<char>(FoldCase(static_cast<unsigned char>(c)));
  return folded;
}

bool ContainsIgnoringCase(const std::string& text, const std::string& word) {
  return Folded(text).find(Folded(word)) != std::string::npos;
}

bool EndsWithIgnoringCase(const std::string& text, const std::string& tail) {
  return text.size() >= tail.size() &&
         Folded(text.substr(text.size() - tail.size())) == Folded(tail);
}

std::size_t Utf8CutLength(const std::string& text, std::size_t limit) {
  if (text.size() <= limit) return text.size();
  std::size_t cut = limit;
  // Step back over continuation bytes to the start of the cut character.
  while (cut > 0 && (static_cast<unsigned char>(text[cut]) & 0xC0) == 0x80) --cut;
  return cut;
}

std::string CutUtf8(const std::string& text, std::size_t limit) {
  return text.substr(0, Utf8CutLength(text, limit));
}

std::string TrimBlanks(const std::string& text) {
  const char* blanks = " \t\r\n";
  const std::size_t begin = text.find_first_not_of(blanks);
  if (begin == std::string::npos) return std::string();
  return text.substr(begin, text.find_last_not_of(blanks) - begin + 1);
}
