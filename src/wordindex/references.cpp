// Turning one word's reference block into Locations items: document labels
// and their pages.
#include "wordindex/references.h"

#include <cstdio>
#include <cstring>

#include "base/trace.h"
#include "text/text.h"
#include "wordindex/wordindex.h"

int LoadWordReferences(int32_t offset, const char* word, std::vector<std::string>& items) {
  if (word == nullptr) word = "";
  unsigned char header[4];
  char label[kLabelBufferSize];
  if (!ReadIndexBytes(offset, header, sizeof header) ||
      !ReadIndexBytes(static_cast<int64_t>(offset) + 4, label, header[0])) {
    TraceMessage("ERROR: References outside Word Index file for: ", word);
    return 0;
  }
  label[header[0]] = '\0';
  if (CompareIgnoringCase(label, word) != 0) {
    TraceMessage("ERROR: Mismatched References label: ", label);
    return 0;
  }

  const int64_t entriesAt = static_cast<int64_t>(offset) + 4 + header[0];
  int64_t size = (header[1] << 16) | (header[2] << 8) | header[3];
  if (size > WordIndexSize - entriesAt) {
    size = WordIndexSize - entriesAt;
    TraceMessage("WARNING: References cut at the end of Word Index file for: ", word);
  }
  std::vector<unsigned char> entries(static_cast<std::size_t>(size));
  if (!ReadIndexBytes(entriesAt, entries.data(), entries.size())) return 0;

  int count = 0;
  bool unnamed = false;
  for (const ReferenceLocation& location : DecodeReferenceEntries(entries.data(), entries.size())) {
    // A location whose index names no label cannot be opened: it yields no
    // item, and its pages go with it.
    if (location.label < 1 || location.label > LabelCount) {
      unnamed = true;
      continue;
    }
    char name[kLabelBufferSize];
    ReadIndexLabel(location.label, name, sizeof name);
    std::string text = name;
    text += "#page=";
    for (int page : location.pages) {
      if (text.size() >= kPageListCut) break;
      char number[16];
      snprintf(number, sizeof number, "%d ", page);
      text += number;
    }
    items.push_back(std::move(text));
    ++count;
  }
  if (unnamed) TraceMessage("WARNING: References to no label in Word Index file for: ", word);
  return count;
}
