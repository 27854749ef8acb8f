// Fuzz target for the word index file, shared by the libFuzzer driver and the
// corpus replay: opened from the bytes, then every reader runs over it.
#pragma once

#include <cstring>
#include <string>
#include <vector>

#include "wordindex/references.h"
#include "wordindex/wordindex.h"
#include "wordindex/wordlist.h"

inline void FuzzCheck(bool ok) {
  if (!ok) __builtin_trap();
}

inline int FuzzWordIndexInput(const uint8_t* data, size_t size) {
  if (!OpenWordIndexFromMemory(data, size, "fuzz.Index")) return FuzzCheck(!WordIndexHandle), 0;
  // Every stored word, some others, and blocks at offsets the file does not point at.
  std::vector<std::pair<std::string, int32_t>> blocks = {{"", int32_t(size / 3)}, {"", -1}};
  for (int L = MinWordLength; L <= MaxWordLength; ++L)
    for (int64_t at = LengthOffsets[L]; at + L + 5 <= LengthOffsets[L + 1]; at += L + 5) {
      std::string word(static_cast<std::size_t>(L), '\0');
      FuzzCheck(ReadIndexBytes(at, &word[0], word.size()));
      blocks.emplace_back(word.c_str(), FindIndexWord(word.c_str()));
    }
  for (const char* word : {"", "a", "\\section", "{align}"}) blocks.emplace_back(word, 0);
  for (auto& [word, offset] : blocks) {
    std::vector<std::string> items{"before"};
    offset = offset < 0 ? int32_t(size) - 1 : offset ? offset : FindIndexWord(word.c_str());
    const int count = offset ? LoadWordReferences(offset, word.c_str(), items) : 0;
    FuzzCheck(count >= 0 && items.size() == 1 + std::size_t(count) && items[0] == "before");
    for (std::size_t i = 1; i < items.size(); ++i)  // a label, "#page=", pages up to the cut
      FuzzCheck(items[i].find("#page=") != std::string::npos &&
                items[i].size() <= kLabelBufferSize + 5);
  }
  for (int k = -1; k <= LabelCount + 1; ++k) {  // a small buffer only at the table's ends
    const std::size_t n = k > 2 && k < LabelCount - 1 ? kLabelBufferSize : 5;
    std::vector<char> buffer(n + 1, 'Z');
    const int length = ReadIndexLabel(k, buffer.data(), n);
    FuzzCheck(buffer[n] == 'Z' && length >= 0 && std::size_t(length) < n &&
              std::strlen(buffer.data()) == std::size_t(length) &&
              (length == 0 || (k >= 1 && k <= LabelCount)));
  }
  WordListData list;
  FuzzCheck(Fill_WordIndex(list) == 1);
  for (std::size_t i = 0; i < list.Words.size(); ++i)
    FuzzCheck(!std::strchr(list.Words[i], '@') &&
              (i == 0 || CompareIndexWords(list.Words[i - 1], list.Words[i]) <= 0));
  for (const char* text : {"", "a", "\\", "{", "sec"})
    FuzzCheck(FindWordInList(list.Words, text, 1) < static_cast<int>(list.Words.size()));
  CloseWordIndex();
  return 0;
}
