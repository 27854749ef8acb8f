// Fuzz target for the word index file, shared by the libFuzzer driver and the
// corpus replay: opened from the bytes, then every reader runs over it.
#pragma once

#include <algorithm>
#include <cstring>
#include <string>
#include <vector>

#include "wordindex/references.h"
#include "wordindex/wordindex.h"
#include "wordindex/wordlist.h"

inline void FuzzCheck(bool ok) {
  if (!ok) __builtin_trap();
}

inline void FuzzCheckReferences(int32_t offset, const char* word) {
  std::vector<std::string> items{"before"};
  const int count = LoadWordReferences(offset, word, items);
  FuzzCheck(count >= 0 && items.size() == 1 + static_cast<std::size_t>(count) &&
            items[0] == "before");
  for (std::size_t i = 1; i < items.size(); ++i)  // a label, "#page=", pages up to the cut
    FuzzCheck(items[i].find("#page=") != std::string::npos &&
              items[i].size() <= kLabelBufferSize + 5);
}

inline int FuzzWordIndexInput(const uint8_t* data, size_t size) {
  if (!OpenWordIndexFromMemory(data, size, "fuzz.Index")) {
    FuzzCheck(WordIndexHandle == nullptr);
    return 0;
  }
  FuzzCheck(WordIndexSize == static_cast<int64_t>(size));
  // Every stored word, some others, one from the data, and blocks the file does not point at.
  std::vector<std::string> words = {"", "a", "\\section", "{align}", "abc"};
  for (int L = MinWordLength; L <= MaxWordLength; ++L)
    for (int64_t at = LengthOffsets[L]; at + L + 5 <= LengthOffsets[L + 1]; at += L + 5) {
      std::string word(static_cast<std::size_t>(L), '\0');
      FuzzCheck(ReadIndexBytes(at, &word[0], word.size()));
      words.push_back(word.c_str());
    }
  const char* middle = reinterpret_cast<const char*>(data) + size / 2;
  words.push_back(std::string(middle, std::min<std::size_t>(size - size / 2, 40)).c_str());
  for (const std::string& word : words)
    if (const int32_t offset = FindIndexWord(word.c_str()))
      FuzzCheckReferences(offset, word.c_str());
  FuzzCheckReferences(static_cast<int32_t>(size / 3), words.back().c_str());
  FuzzCheckReferences(static_cast<int32_t>(size) - 1, "");
  for (int k = -1; k <= LabelCount + 1; ++k)  // small buffers only at the table's ends
    for (std::size_t bufferSize : {std::size_t{1}, std::size_t{5}, std::size_t{kLabelBufferSize}}) {
      if (k > 2 && k < LabelCount - 1 && bufferSize != kLabelBufferSize) continue;
      std::vector<char> buffer(bufferSize + 1, 'Z');
      const int n = ReadIndexLabel(k, buffer.data(), bufferSize);
      FuzzCheck(buffer[bufferSize] == 'Z' && n >= 0 && static_cast<std::size_t>(n) < bufferSize &&
                std::strlen(buffer.data()) == static_cast<std::size_t>(n));
    }
  WordListData list;
  FuzzCheck(Fill_WordIndex(list) == 1);
  for (std::size_t i = 0; i < list.Words.size(); ++i)
    FuzzCheck(!std::strchr(list.Words[i], '@') &&
              (i == 0 || CompareIndexWords(list.Words[i - 1], list.Words[i]) <= 0));
  for (const char* text : {"", "a", "\\", "{", "sec"}) {
    const int row = FindWordInList(list.Words, text, 0);
    FuzzCheck(row >= -1 && row < static_cast<int>(list.Words.size()));
    FindWordInList(list.Words, text, 1);
  }
  CloseWordIndex();
  return 0;
}
