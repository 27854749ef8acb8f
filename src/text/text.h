// Small rules on 8-bit strings that every part of the program shares.
#pragma once

#include <cstddef>
#include <string>

// ASCII letters folded to lower case.
inline unsigned char FoldCase(unsigned char c) {
  return (c >= 'A' && c <= 'Z') ? static_cast<unsigned char>(c - 'A' + 'a') : c;
}

// The one case-insensitive order of the program: ASCII letters folded to
// lower case, then unsigned bytes.  <0, 0, >0.
inline int CompareIgnoringCase(const char* a, const char* b) {
  const unsigned char* x = reinterpret_cast<const unsigned char*>(a);
  const unsigned char* y = reinterpret_cast<const unsigned char*>(b);
  for (;; ++x, ++y) {
    const unsigned char cx = FoldCase(*x);
    const unsigned char cy = FoldCase(*y);
    if (cx != cy) return cx < cy ? -1 : 1;
    if (cx == '\0') return 0;
  }
}

// `text` without blanks, tabs and line ends at either end.
std::string TrimBlanks(const std::string& text);

// `text` with its ASCII letters folded.
std::string Folded(const std::string& text);

// True when `word` stands anywhere in `text`, letters compared ignoring case.
bool ContainsIgnoringCase(const std::string& text, const std::string& word);

// True when `text` ends in `tail`, letters compared ignoring case.
bool EndsWithIgnoringCase(const std::string& text, const std::string& tail);

// Length of the longest prefix of `text` within `limit` bytes that does not
// end inside a UTF-8 sequence.
std::size_t Utf8CutLength(const std::string& text, std::size_t limit);

// `text` cut to at most `limit` bytes at a character boundary.
std::string CutUtf8(const std::string& text, std::size_t limit);
