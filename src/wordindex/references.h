// Turning one word's reference block into texts of the Locations list.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

// Appends the index reference items of the block at `offset` to `items` and
// returns the number of locations started; 0 on a label mismatch.
int LoadWordReferences(int32_t offset, const char* word, std::vector<std::string>& items);

// One location of a reference block's entry list: a label index (which may
// name no label) and its pages in file order.
struct ReferenceLocation {
  int label = 0;
  std::vector<int> pages;
};

// Decodes an entry list (compact form when bit 7 of its first byte is set,
// long form otherwise).  Pages met before any location has started are
// dropped; a label index that returns after another starts a new location.
std::vector<ReferenceLocation> DecodeReferenceEntries(const unsigned char* entries,
                                                      std::size_t size);

// Page numbers are appended to a location's text only while it is shorter
// than this.
constexpr std::size_t kPageListCut = 200;
