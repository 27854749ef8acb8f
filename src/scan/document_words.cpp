// Text form of a document's words.
#include "scan/document_words.h"

#include <cstdlib>
#include <sstream>

namespace {

const char kMagic[] = "docuvane-document 1";

// Titles and errors are free text: keep them on their line.
std::string OneLine(const std::string& text) {
  std::string out;
  for (char c : text) out += (c == '\n' || c == '\r' || c == '\t') ? ' ' : c;
  return out;
}

bool ToInt(const std::string& text, int& value) {
  if (text.empty() || text.size() > 9) return false;
  for (char c : text)
    if (c < '0' || c > '9') return false;
  value = std::atoi(text.c_str());
  return true;
}

std::vector<std::string> Split(const std::string& text, char at) {
  std::vector<std::string> parts;
  std::size_t start = 0;
  for (;;) {
    const std::size_t end = text.find(at, start);
    parts.push_back(text.substr(start, end == std::string::npos ? std::string::npos : end - start));
    if (end == std::string::npos) return parts;
    start = end + 1;
  }
}

}  // namespace

std::string SerializeDocumentWords(const DocumentWords& w) {
  std::ostringstream out;
  out << kMagic << "\n";
  if (!w.error.empty()) out << "error\t" << OneLine(w.error) << "\n";
  out << "title\t" << OneLine(w.title) << "\n";
  out << "pages\t" << w.pages << "\n";
  out << "links\t" << w.indexLinks << "\n";
  for (const auto& [word, pages] : w.indexed) {
    out << "x\t" << word << "\t";
    for (std::size_t i = 0; i < pages.size(); ++i) out << (i ? " " : "") << pages[i];
    out << "\n";
  }
  for (const auto& [word, pages] : w.occurs) {
    auto total = w.totals.find(word);
    out << "o\t" << word << "\t" << (total == w.totals.end() ? 0 : total->second) << "\t";
    for (std::size_t i = 0; i < pages.size(); ++i)
      out << (i ? " " : "") << pages[i].page << ":" << pages[i].count;
    out << "\n";
  }
  out << "end\n";
  return out.str();
}

bool ParseDocumentWords(const std::string& text, DocumentWords& w) {
  w = DocumentWords();
  std::vector<std::string> lines = Split(text, '\n');
  if (lines.size() < 2 || lines[0] != kMagic || lines.back() != "" ||
      lines[lines.size() - 2] != "end")
    return false;
  for (std::size_t i = 1; i + 2 < lines.size(); ++i) {
    const std::vector<std::string> f = Split(lines[i], '\t');
    if (f[0] == "error" && f.size() == 2) {
      w.error = f[1];
    } else if (f[0] == "title" && f.size() == 2) {
      w.title = f[1];
    } else if (f[0] == "pages" && f.size() == 2) {
      if (!ToInt(f[1], w.pages)) return false;
    } else if (f[0] == "links" && f.size() == 2) {
      if (!ToInt(f[1], w.indexLinks)) return false;
    } else if (f[0] == "x" && f.size() == 3 && !f[1].empty()) {
      std::vector<int>& pages = w.indexed[f[1]];
      for (const std::string& p : Split(f[2], ' ')) {
        int page = 0;
        if (!ToInt(p, page)) return false;
        pages.push_back(page);
      }
    } else if (f[0] == "o" && f.size() == 4 && !f[1].empty()) {
      if (!ToInt(f[2], w.totals[f[1]])) return false;
      std::vector<PageCount>& pages = w.occurs[f[1]];
      for (const std::string& p : Split(f[3], ' ')) {
        const std::vector<std::string> pc = Split(p, ':');
        PageCount entry;
        if (pc.size() != 2 || !ToInt(pc[0], entry.page) || !ToInt(pc[1], entry.count)) return false;
        pages.push_back(entry);
      }
    } else {
      return false;
    }
  }
  return true;
}
