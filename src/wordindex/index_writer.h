// Building word index files ("WX") from listings, and listing them back.
//
// A listing has one reference per line: word, TAB, label, TAB, page numbers
// separated by blanks.  A word may have several lines; each line is one
// location.  Labels are numbered in the order they first appear.
#pragma once

#include <cstdint>
#include <istream>
#include <map>
#include <ostream>
#include <string>
#include <vector>

struct IndexLocation {
  int label = 0;  // 1-based label index
  std::vector<int> pages;
};

class WordIndexBuilder {
 public:
  // Entry list form of every reference block.
  enum class Form { Compact, Long };

  // Adds one location of `word`; false with `error` set when it breaks a
  // limit of the file format.
  bool Add(const std::string& word, const std::string& label, const std::vector<int>& pages,
           std::string& error);

  // Numbers `label` now if it is new (labels are otherwise numbered as their
  // first word comes); false with `error` beyond the format's limits.
  bool AddLabel(const std::string& label, std::string& error);

  // Reads a whole listing; false with `error` naming the line on the first
  // bad line.
  bool AddListing(std::istream& in, std::string& error);

  // The file's bytes; false with `error` when it cannot be laid out.
  bool Build(Form form, std::vector<uint8_t>& out, std::string& error) const;

  std::size_t WordCount() const { return words_.size(); }
  std::size_t LabelCount() const { return labels_.size(); }

 private:
  std::vector<std::string> labels_;
  std::map<std::string, int> labelIndex_;
  // Per word, its locations in the order of the lines.
  std::map<std::string, std::vector<IndexLocation>> words_;
};

// Writes the open word index (see wordindex.h) as a listing, words in file
// order.  Locations whose label index names no label are left out and
// counted in `skipped`.  False when the index cannot be read.
bool DumpWordIndex(std::ostream& out, int& skipped);

// Limits of the format that the builder checks.
constexpr std::size_t kMaxIndexWordLength = 255;
constexpr std::size_t kMaxIndexLabelLength = 255;
constexpr int kMaxIndexPage = 32767;
