// What one document contributes to the index, in a form that travels from
// a reading process to the scanner and into the scan cache.
#pragma once

#include <map>
#include <string>
#include <vector>

struct PageCount {
  int page = 0;   // physical, from 1
  int count = 0;  // occurrences on that page, kDescribedWeight for each shown
                  // with meta-variable arguments
};

// What one occurrence of a word shown with its arguments counts for: the
// page that describes a command ranks before pages that only use it.
constexpr int kDescribedWeight = 20;

struct DocumentWords {
  std::string error;  // not empty: the document could not be read, and why
  std::string title;
  int pages = 0;
  int indexLinks = 0;  // links of its printed index that were understood
  // Words of the printed index and the physical pages its links lead to.
  std::map<std::string, std::vector<int>> indexed;
  // Every other word found in the text: its busiest pages, busiest first,
  // and the total number of occurrences.
  std::map<std::string, std::vector<PageCount>> occurs;
  std::map<std::string, int> totals;
};

// How many of a word's busiest pages are kept per document.
constexpr std::size_t kKeptPagesPerWord = 16;

// One line per item, text only; Parse rejects anything Serialize did not
// write (a cache cut short or edited by hand).
std::string SerializeDocumentWords(const DocumentWords& words);
bool ParseDocumentWords(const std::string& text, DocumentWords& words);
