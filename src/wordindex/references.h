// Turning one word into the texts of the Locations list.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

// Appends the index reference items of the block at `offset` to `items` and
// returns the number of locations started; 0 on a label mismatch.
int LoadWordReferences(int32_t offset, const char* word, std::vector<std::string>& items);

// The keyword target items of `word` ("path#anchor", newest first), and the
// single target (path, anchor) when the word has exactly one.
struct KeywordTargets {
  std::vector<std::string> items;
  bool single = false;
  std::string singlePath;
  std::string singleAnchor;
};
KeywordTargets CollectKeywordTargets(const char* word);
