// Fuzz target for the word index file: opened from the bytes, then every
// reader of the program runs over it (lookups of every stored word and of
// some others, every label, every reference block, the word list).  Shared
// by the libFuzzer driver and the corpus replay in the unit tests.
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <string>
#include <vector>

#include "wordindex/references.h"
#include "wordindex/wordindex.h"
#include "wordindex/wordlist.h"

inline void FuzzCheckReferences(int32_t offset, const char* word) {
  std::vector<std::string> items{"before"};
  const int count = LoadWordReferences(offset, word, items);
  if (count < 0 || items.size() != 1 + static_cast<std::size_t>(count)) __builtin_trap();
  if (items[0] != "before") __builtin_trap();
  for (std::size_t i = 1; i < items.size(); ++i) {
    if (items[i].find("#page=") == std::string::npos) __builtin_trap();
    // A label of at most 255 bytes and "#page=", or pages up to the cut.
    if (items[i].size() > kLabelBufferSize - 1 + 6) __builtin_trap();
  }
}

inline int FuzzWordIndexInput(const uint8_t* data, size_t size) {
  if (!OpenWordIndexFromMemory(data, size, "fuzz.Index")) {
    if (WordIndexHandle != nullptr) __builtin_trap();
    return 0;
  }
  if (WordIndexSize != static_cast<int64_t>(size)) __builtin_trap();

  // Every stored word is found again, unless an equal word stands before it
  // in a damaged (unsorted) group; whatever is found is read back.
  for (int L = MinWordLength; L <= MaxWordLength; ++L) {
    const int64_t records = (LengthOffsets[L + 1] - LengthOffsets[L]) / (L + 5);
    for (int64_t i = 0; i < records; ++i) {
      std::string word(static_cast<std::size_t>(L), '\0');
      if (!ReadIndexBytes(LengthOffsets[L] + i * (L + 5), &word[0], word.size())) __builtin_trap();
      const std::string text = word.c_str();  // as a C string it may be shorter
      const int32_t offset = FindIndexWord(text.c_str());
      if (offset != 0) FuzzCheckReferences(offset, text.c_str());
    }
  }
  static const char* const kOthers[] = {"", "a", "\\section", "{align}", "abc", "x.pdf"};
  for (const char* word : kOthers) {
    const int32_t offset = FindIndexWord(word);
    if (offset != 0) FuzzCheckReferences(offset, word);
  }
  // Blocks at offsets the file does not point at, and a word from the data.
  const std::string tail(reinterpret_cast<const char*>(data) + size / 2,
                         std::min<std::size_t>(size - size / 2, 40));
  const std::string fromData = tail.c_str();
  FuzzCheckReferences(static_cast<int32_t>(size / 3), fromData.c_str());
  FuzzCheckReferences(static_cast<int32_t>(size) - 1, "");
  FindIndexWord(fromData.c_str());

  for (int k = -1; k <= LabelCount + 1; ++k) {
    for (std::size_t bufferSize : {std::size_t{1}, std::size_t{5}, std::size_t{kLabelBufferSize}}) {
      std::vector<char> buffer(bufferSize + 1, '\x5a');
      const int n = ReadIndexLabel(k, buffer.data(), bufferSize);
      if (buffer[bufferSize] != '\x5a') __builtin_trap();
      if (n < 0 || static_cast<std::size_t>(n) >= bufferSize ||
          std::strlen(buffer.data()) != static_cast<std::size_t>(n))
        __builtin_trap();
    }
  }

  WordListData list;
  if (Fill_WordIndex(list) != 1) __builtin_trap();
  for (const char* word : list.Words) {
    if (std::strchr(word, '@') != nullptr) __builtin_trap();
  }
  for (std::size_t i = 1; i < list.Words.size(); ++i)
    if (CompareIndexWords(list.Words[i - 1], list.Words[i]) > 0) __builtin_trap();
  for (const char* text : {"", "a", "\\", "{", "sec"}) {
    const int row = FindWordInList(list.Words, text, 0);
    if (row < -1 || row >= static_cast<int>(list.Words.size())) __builtin_trap();
    FindWordInList(list.Words, text, 1);
  }
  CloseWordIndex();
  return 0;
}
