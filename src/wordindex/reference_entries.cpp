// Decoding the entry list of a reference block, apart from the file so that
// the tools can use it without the catalogue.
#include "wordindex/references.h"

std::vector<ReferenceLocation> DecodeReferenceEntries(const unsigned char* entries,
                                                      std::size_t size) {
  std::vector<ReferenceLocation> locations;
  if (entries == nullptr || size == 0) return locations;
  if (entries[0] & 0x80) {
    // Compact form: an entry with bit 15 set starts a location, any other
    // is a page of the location last started.
    for (std::size_t i = 0; i + 2 <= size; i += 2) {
      const int entry = (entries[i] << 8) | entries[i + 1];
      if (entry & 0x8000)
        locations.push_back({entry & 0x7FFF, {}});
      else if (!locations.empty())
        locations.back().pages.push_back(entry);
    }
  } else {
    // Long form: label index and page per entry; a change of label index
    // starts a location.  The first location starts at the first non-zero
    // index, since index 0 names no label.
    int current = 0;
    for (std::size_t i = 0; i + 4 <= size; i += 4) {
      const int label = (entries[i] << 8) | entries[i + 1];
      const int page = (entries[i + 2] << 8) | entries[i + 3];
      if (label != current) {
        locations.push_back({label, {}});
        current = label;
      }
      if (!locations.empty()) locations.back().pages.push_back(page);
    }
  }
  return locations;
}
