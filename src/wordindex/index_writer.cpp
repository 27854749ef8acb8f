// Building word index files from listings, and listing them back.
#include "wordindex/index_writer.h"

#include <cstring>

#include "wordindex/references.h"
#include "wordindex/wordindex.h"

namespace {

void Put(std::vector<uint8_t>& out, uint64_t value, int width) {
  for (int shift = (width - 1) * 8; shift >= 0; shift -= 8)
    out.push_back(static_cast<uint8_t>(value >> shift));
}

void PutAt(std::vector<uint8_t>& out, std::size_t at, uint64_t value, int width) {
  for (int i = 0; i < width; ++i)
    out[at + i] = static_cast<uint8_t>(value >> ((width - 1 - i) * 8));
}

bool ParsePage(const std::string& text, int& page) {
  if (text.empty() || text.size() > 9) return false;
  page = 0;
  for (char c : text) {
    if (c < '0' || c > '9') return false;
    page = page * 10 + (c - '0');
  }
  return true;
}

}  // namespace

bool WordIndexBuilder::Add(const std::string& word, const std::string& label,
                           const std::vector<int>& pages, std::string& error) {
  if (word.empty()) {
    error = "empty word";
    return false;
  }
  if (word.size() > kMaxIndexWordLength) {
    error = "word longer than 255 bytes";
    return false;
  }
  if (label.empty()) {
    error = "empty label";
    return false;
  }
  if (label.size() > kMaxIndexLabelLength) {
    error = "label longer than 255 bytes";
    return false;
  }
  for (int page : pages) {
    if (page < 0 || page > kMaxIndexPage) {
      error = "page number above 32767: " + std::to_string(page);
      return false;
    }
  }
  if (!AddLabel(label, error)) return false;
  words_[word].push_back({labelIndex_.at(label), pages});
  return true;
}

bool WordIndexBuilder::AddLabel(const std::string& label, std::string& error) {
  if (label.empty() || label.size() > kMaxIndexLabelLength) {
    error = label.empty() ? "empty label" : "label longer than 255 bytes";
    return false;
  }
  if (labelIndex_.count(label) != 0) return true;
  if (labels_.size() >= static_cast<std::size_t>(kMaxLabels)) {
    error = "too many labels (more than 8190)";
    return false;
  }
  labels_.push_back(label);
  labelIndex_.emplace(label, static_cast<int>(labels_.size()));
  return true;
}

bool WordIndexBuilder::AddListing(std::istream& in, std::string& error) {
  std::string line;
  for (long number = 1; std::getline(in, line); ++number) {
    if (!line.empty() && line.back() == '\r') line.pop_back();
    if (line.empty()) continue;
    auto fail = [&](const std::string& why) {
      error = "line " + std::to_string(number) + ": " + why;
      return false;
    };
    const std::size_t tab = line.find('\t');
    if (tab == std::string::npos) return fail("no tab between word and label");
    const std::size_t tab2 = line.find('\t', tab + 1);
    const std::string word = line.substr(0, tab);
    const std::string label =
        line.substr(tab + 1, tab2 == std::string::npos ? std::string::npos : tab2 - tab - 1);
    std::vector<int> pages;
    if (tab2 != std::string::npos) {
      const std::string rest = line.substr(tab2 + 1);
      std::size_t at = 0;
      while (at < rest.size()) {
        if (rest[at] == ' ' || rest[at] == '\t') {
          ++at;
          continue;
        }
        std::size_t end = rest.find_first_of(" \t", at);
        if (end == std::string::npos) end = rest.size();
        const std::string token = rest.substr(at, end - at);
        int page = 0;
        if (!ParsePage(token, page)) {
          const bool digits = token.find_first_not_of("0123456789") == std::string::npos;
          return fail(digits ? "page number above 32767: " + token : "bad page number: " + token);
        }
        pages.push_back(page);
        at = end;
      }
    }
    std::string why;
    if (!Add(word, label, pages, why)) return fail(why);
  }
  if (in.bad()) {
    error = "read error";
    return false;
  }
  return true;
}

bool WordIndexBuilder::Build(Form form, std::vector<uint8_t>& out, std::string& error) const {
  out.clear();
  // Words by length, each group in unsigned byte order (std::map's order).
  std::vector<std::vector<const std::pair<const std::string, std::vector<IndexLocation>>*>>
      byLength(kMaxIndexWordLength + 1);
  int minLength = 256;
  int maxLength = -1;
  for (const auto& entry : words_) {
    const int L = static_cast<int>(entry.first.size());
    byLength[L].push_back(&entry);
    if (L < minLength) minLength = L;
    if (L > maxLength) maxLength = L;
  }
  if (words_.empty()) {
    // No words: one group offset, for length 1, that starts and ends the area.
    minLength = 1;
    maxLength = 0;
  }

  // Reference blocks, in record order.
  std::vector<std::vector<uint8_t>> blocks;
  for (int L = minLength; L <= maxLength; ++L) {
    for (const auto* entry : byLength[L]) {
      std::vector<uint8_t> entries;
      for (const IndexLocation& location : entry->second) {
        if (form == Form::Compact) {
          Put(entries, 0x8000u | static_cast<unsigned>(location.label), 2);
          for (int page : location.pages) Put(entries, static_cast<unsigned>(page), 2);
        } else {
          if (location.pages.empty()) {
            error = "a location without pages cannot be written in the long form: " + entry->first +
                    " " + labels_[location.label - 1];
            return false;
          }
          for (int page : location.pages) {
            Put(entries, static_cast<unsigned>(location.label), 2);
            Put(entries, static_cast<unsigned>(page), 2);
          }
        }
      }
      if (entries.size() > 0xFFFFFF) {
        error = "too many references for one word: " + entry->first;
        return false;
      }
      std::vector<uint8_t> block;
      block.reserve(4 + L + entries.size());
      Put(block, static_cast<uint64_t>(L), 1);
      Put(block, entries.size(), 3);
      block.insert(block.end(), entry->first.begin(), entry->first.end());
      block.insert(block.end(), entries.begin(), entries.end());
      blocks.push_back(std::move(block));
    }
  }

  const int groups = maxLength - minLength + 2;
  const uint64_t headerSize = 4 + 4ull * groups + 2 + 3ull * (labels_.size() + 1);
  uint64_t recordArea = 0;
  for (int L = minLength; L <= maxLength; ++L) recordArea += byLength[L].size() * (L + 5ull);
  uint64_t blockBytes = 0;
  for (const auto& block : blocks) blockBytes += block.size();
  uint64_t labelBytes = 0;
  for (const auto& label : labels_) labelBytes += label.size();

  // Labels usually come last; their offsets have only 24 bits, so a large
  // index puts them right after the header instead.
  const bool labelsLast = headerSize + recordArea + blockBytes + labelBytes <= 0xFFFFFF;
  const uint64_t total = headerSize + recordArea + blockBytes + labelBytes;
  if (total > static_cast<uint64_t>(INT32_MAX)) {
    error = "index would reach 2 GiB";
    return false;
  }
  const uint64_t labelsAt = labelsLast ? headerSize + recordArea + blockBytes : headerSize;
  const uint64_t recordsAt = labelsLast ? headerSize : headerSize + labelBytes;
  const uint64_t blocksAt = recordsAt + recordArea;

  out.reserve(total);
  out.push_back('W');
  out.push_back('X');
  Put(out, static_cast<uint64_t>(minLength), 1);
  Put(out, static_cast<uint64_t>(maxLength), 1);
  uint64_t at = recordsAt;
  for (int L = minLength; L <= maxLength + 1; ++L) {
    Put(out, at, 4);
    if (L <= maxLength) at += byLength[L].size() * (L + 5ull);
  }
  Put(out, labels_.size(), 2);
  at = labelsAt;
  for (std::size_t k = 0; k <= labels_.size(); ++k) {
    Put(out, at, 3);
    if (k < labels_.size()) at += labels_[k].size();
  }
  out.resize(total, 0);

  std::size_t record = recordsAt;
  uint64_t block = blocksAt;
  std::size_t blockNumber = 0;
  for (int L = minLength; L <= maxLength; ++L) {
    for (const auto* entry : byLength[L]) {
      memcpy(&out[record], entry->first.data(), L);
      PutAt(out, record + L, block, 4);
      out[record + L + 4] = 0;  // the record's fifth byte carries nothing
      const auto& bytes = blocks[blockNumber++];
      memcpy(&out[block], bytes.data(), bytes.size());
      block += bytes.size();
      record += L + 5;
    }
  }
  std::size_t labelAt = labelsAt;
  for (const auto& label : labels_) {
    memcpy(&out[labelAt], label.data(), label.size());
    labelAt += label.size();
  }
  return true;
}

bool DumpWordIndex(std::ostream& out, int& skipped) {
  skipped = 0;
  if (WordIndexHandle == nullptr) return false;
  for (int L = MinWordLength; L <= MaxWordLength; ++L) {
    const int64_t size = L + 5;
    const int64_t count = (LengthOffsets[L + 1] - LengthOffsets[L]) / size;
    for (int64_t i = 0; i < count; ++i) {
      unsigned char record[260];
      if (!ReadIndexBytes(LengthOffsets[L] + i * size, record, L + 4)) return false;
      const std::string text(reinterpret_cast<char*>(record), L);
      const int64_t offset =
          (int64_t{record[L]} << 24) | (record[L + 1] << 16) | (record[L + 2] << 8) | record[L + 3];
      unsigned char header[4];
      if (!ReadIndexBytes(offset, header, 4)) return false;
      const int64_t entriesAt = offset + 4 + header[0];
      int64_t entrySize = (header[1] << 16) | (header[2] << 8) | header[3];
      if (entriesAt > WordIndexSize) return false;
      if (entrySize > WordIndexSize - entriesAt) entrySize = WordIndexSize - entriesAt;
      std::vector<unsigned char> entries(static_cast<std::size_t>(entrySize));
      if (!ReadIndexBytes(entriesAt, entries.data(), entries.size())) return false;
      for (const ReferenceLocation& location :
           DecodeReferenceEntries(entries.data(), entries.size())) {
        if (location.label < 1 || location.label > LabelCount) {
          ++skipped;
          continue;
        }
        char label[kLabelBufferSize];
        ReadIndexLabel(location.label, label, sizeof label);
        out << text << '\t' << label << '\t';
        for (std::size_t p = 0; p < location.pages.size(); ++p)
          out << (p ? " " : "") << location.pages[p];
        out << '\n';
      }
    }
  }
  return static_cast<bool>(out);
}
