// The documentation scan: finding documents, reading them in isolation,
// keeping their results, and turning them into a word index.
#include "scan/scanner.h"

#include <algorithm>
#include <chrono>
#include <map>
#include <set>

#include "platform/dirs.h"
#include "platform/files.h"
#include "platform/worker.h"
#include "scan/document_words.h"
#include "scan/pdf_reader.h"
#include "scan/words.h"
#include "wordindex/index_writer.h"
#include "wordindex/wordindex.h"

const char* const kScanIndexFile = "Update/command.Index";
const char* const kScanIniFile = "Docuvane/Docuvane.ini";
const char* const kScanCacheFile = "Docuvane/scan.cache";

namespace {

// Pages kept per word and document for words found in the text: the
// busiest ones.  A manual with a printed index says itself where a word is
// explained, so its other mentions get fewer.
constexpr std::size_t kOccurrencePages = 4;
constexpr std::size_t kOccurrencePagesBesideIndex = 2;
// A document counts as having a hyperlinked printed index from this many
// understood index links on.
constexpr int kIndexedDocumentLinks = 10;
// A word mentioned in more documents than this (\documentclass, \begin)
// keeps its mentions only in the documents that use it most; what printed
// indexes and names give is always kept.
constexpr std::size_t kOccurrenceDocuments = 40;
constexpr int kMaxDirectoryDepth = 24;
const char kCacheMagic[] = "docuvane-scan-cache 2";
// Caches of other versions count the words otherwise: read again, quietly.
const char kCacheFamily[] = "docuvane-scan-cache ";

struct Document {
  std::string label;  // relative to the tree's doc/
  std::string path;
  FileStamp stamp;
  bool pdf = false;
  DocumentWords words;
  bool known = false;  // words filled (read or cached)
};

bool EndsWith(const std::string& s, const char* tail) {
  const std::size_t n = std::char_traits<char>::length(tail);
  if (s.size() < n) return false;
  for (std::size_t i = 0; i < n; ++i) {
    char c = s[s.size() - n + i];
    if (c >= 'A' && c <= 'Z') c = static_cast<char>(c - 'A' + 'a');
    if (c != tail[i]) return false;
  }
  return true;
}

class Walker {
 public:
  // Calls `visit(relative path, entry)` for every regular file below
  // `root`, following links but never into a directory twice.
  template <typename Visit>
  void Walk(const std::string& root, const std::string& relative, int depth, bool htmlCovered,
            Visit& visit) {
    FileStamp stamp;
    if (depth > kMaxDirectoryDepth || !StampOf(root, stamp)) return;
    if (!seen_.insert({stamp.device, stamp.inode}).second) return;
    std::vector<DirectoryEntry> entries;
    if (!ListDirectory(root, entries)) return;
    std::sort(entries.begin(), entries.end(),
              [](const DirectoryEntry& a, const DirectoryEntry& b) { return a.name < b.name; });
    bool hasIndexHtml = false;
    for (const DirectoryEntry& e : entries) hasIndexHtml = hasIndexHtml || e.name == "index.html";
    for (const DirectoryEntry& e : entries) {
      const std::string rel = relative.empty() ? e.name : relative + "/" + e.name;
      if (e.directory)
        Walk(root + "/" + e.name, rel, depth + 1, htmlCovered || hasIndexHtml, visit);
      else if (e.regular)
        visit(rel, root + "/" + e.name, htmlCovered, hasIndexHtml);
    }
  }

 private:
  std::set<std::pair<std::uint64_t, std::uint64_t>> seen_;
};

// PDFs, and HTML documents: a directory with an index.html stands for the
// pages below it by that one page.
std::vector<Document> FindDocuments(const std::vector<std::string>& trees) {
  std::vector<Document> documents;
  std::set<std::string> labels;
  for (const std::string& tree : trees) {
    Walker walker;
    auto visit = [&](const std::string& rel, const std::string& path, bool covered, bool hasIndex) {
      const bool pdf = EndsWith(rel, ".pdf");
      bool html = EndsWith(rel, ".html") || EndsWith(rel, ".htm");
      if (html && (covered || (hasIndex && !EndsWith(rel, "/index.html") && rel != "index.html")))
        html = false;
      if (!pdf && !html) return;
      // The first tree that has a document is the one the path search finds.
      if (!labels.insert(rel).second) return;
      Document d;
      d.label = rel;
      d.path = path;
      d.pdf = pdf;
      StampOf(path, d.stamp);
      documents.push_back(d);
    };
    walker.Walk(tree + "/doc", "", 0, false, visit);
  }
  return documents;
}

// Package directory name -> the names of the packages and classes a user
// loads from it (tex/latex/graphics/graphicx.sty gives graphics -> graphicx).
std::map<std::string, std::set<std::string>> FindPackages(const std::vector<std::string>& trees) {
  std::map<std::string, std::set<std::string>> packages;
  for (const std::string& tree : trees) {
    Walker walker;
    auto visit = [&](const std::string& rel, const std::string&, bool, bool) {
      if (!EndsWith(rel, ".sty") && !EndsWith(rel, ".cls")) return;
      const std::size_t a = rel.find('/');
      const std::size_t b = a == std::string::npos ? a : rel.find('/', a + 1);
      if (b == std::string::npos) return;
      const std::string dir = rel.substr(a + 1, b - a - 1);
      const std::size_t slash = rel.rfind('/');
      packages[dir].insert(rel.substr(slash + 1, rel.size() - slash - 5));
    };
    walker.Walk(tree + "/tex", "", 0, false, visit);
  }
  return packages;
}

// ---- cache: per document path, size and modification time -------------

std::string CacheKey(const Document& d) {
  return d.path + "\t" + std::to_string(d.stamp.size) + "\t" + std::to_string(d.stamp.mtimeNs);
}

// False when the file is there but not what this program wrote: the cache
// is then rebuilt from the documents.
bool ReadCache(const std::string& file, std::map<std::string, std::string>& entries) {
  std::string text;
  if (!PathExists(file)) return true;
  if (!ReadWholeFile(file, text, std::size_t{1} << 31)) return false;
  const std::string head = std::string(kCacheMagic) + "\n";
  if (text.compare(0, head.size(), head) != 0) {
    const std::size_t family = std::char_traits<char>::length(kCacheFamily);
    const std::size_t eol = text.find('\n');
    return text.compare(0, family, kCacheFamily) == 0 && eol != std::string::npos && eol > family &&
           eol < family + 8;
  }
  std::size_t at = head.size();
  std::size_t count = 0;
  while (at < text.size()) {
    const std::size_t eol = text.find('\n', at);
    if (eol == std::string::npos) return false;
    const std::string line = text.substr(at, eol - at);
    at = eol + 1;
    if (line.compare(0, 4, "end ") == 0)
      return at == text.size() && line == "end " + std::to_string(count);
    // "doc <bytes>\t<key>", then that many bytes of the document's words.
    if (line.compare(0, 4, "doc ") != 0) return false;
    const std::size_t tab = line.find('\t');
    if (tab == std::string::npos) return false;
    const std::string digits = line.substr(4, tab - 4);
    if (digits.empty() || digits.size() > 10 ||
        digits.find_first_not_of("0123456789") != std::string::npos)
      return false;
    const std::size_t bytes = std::stoul(digits);
    if (bytes > text.size() - at) return false;
    DocumentWords check;
    std::string body = text.substr(at, bytes);
    if (!ParseDocumentWords(body, check)) return false;
    entries[line.substr(tab + 1)] = body;
    at += bytes;
    ++count;
  }
  return false;
}

std::string CacheText(const std::vector<Document>& documents) {
  std::string text = std::string(kCacheMagic) + "\n";
  std::size_t count = 0;
  for (const Document& d : documents) {
    if (!d.pdf || !d.known) continue;
    const std::string body = SerializeDocumentWords(d.words);
    text += "doc " + std::to_string(body.size()) + "\t" + CacheKey(d) + "\n" + body;
    ++count;
  }
  return text + "end " + std::to_string(count) + "\n";
}

// ---- from document results to index locations ----------------------------

struct Candidate {
  std::size_t document = 0;
  int rank = 0;  // 0 names, 1 printed index, 2 mentions
  int weight = 0;
  std::vector<int> pages;
};

std::string Stem(const std::string& label) {
  const std::size_t slash = label.rfind('/');
  std::string name = slash == std::string::npos ? label : label.substr(slash + 1);
  const std::size_t dot = name.rfind('.');
  if (dot != std::string::npos && dot > 0) name.erase(dot);
  return name;
}

// The package directory of a document: "graphics" for latex/graphics/x.pdf.
std::string PackageDirectory(const std::string& label) {
  const std::size_t a = label.find('/');
  const std::size_t b = a == std::string::npos ? a : label.find('/', a + 1);
  return b == std::string::npos ? std::string() : label.substr(a + 1, b - a - 1);
}

void Add(std::map<std::string, std::vector<Candidate>>& words, const std::string& word,
         std::size_t document, int rank, int weight, std::vector<int> pages) {
  if (word.empty() || word.size() > kMaxIndexWordLength) return;
  std::vector<Candidate>& list = words[word];
  for (Candidate& c : list)
    if (c.document == document) {
      // One location per document: the strongest reason keeps its rank.
      c.pages.insert(c.pages.end(), pages.begin(), pages.end());
      c.rank = std::min(c.rank, rank);
      c.weight = std::max(c.weight, weight);
      return;
    }
  list.push_back(Candidate{document, rank, weight, std::move(pages)});
}

std::map<std::string, std::vector<Candidate>> Locations(
    const std::vector<Document>& documents,
    const std::map<std::string, std::set<std::string>>& packages) {
  std::map<std::string, std::vector<Candidate>> words;
  for (std::size_t i = 0; i < documents.size(); ++i) {
    const Document& d = documents[i];
    Add(words, Stem(d.label), i, 0, 0, {1});
    const std::string dir = PackageDirectory(d.label);
    if (!dir.empty()) {
      Add(words, dir, i, 0, 0, {1});
      auto found = packages.find(dir);
      if (found != packages.end())
        for (const std::string& name : found->second) Add(words, name, i, 0, 0, {1});
    }
    if (!d.known || !d.words.error.empty()) continue;
    for (const auto& [word, pages] : d.words.indexed) Add(words, word, i, 1, 0, pages);
    const std::size_t keep = d.words.indexLinks >= kIndexedDocumentLinks
                                 ? kOccurrencePagesBesideIndex
                                 : kOccurrencePages;
    for (const auto& [word, counts] : d.words.occurs) {
      // Pages that describe the word, when there are such: the others only
      // use it.
      const bool described = !counts.empty() && counts[0].count >= kDescribedWeight;
      std::vector<int> pages;
      for (std::size_t k = 0; k < counts.size() && k < keep; ++k)
        if (!described || counts[k].count >= kDescribedWeight) pages.push_back(counts[k].page);
      auto total = d.words.totals.find(word);
      Add(words, word, i, 2, total == d.words.totals.end() ? 0 : total->second, pages);
    }
  }
  for (auto& [word, list] : words) {
    std::stable_sort(list.begin(), list.end(), [](const Candidate& a, const Candidate& b) {
      return a.rank != b.rank ? a.rank < b.rank : a.weight > b.weight;
    });
    std::size_t mentions = 0;
    list.erase(std::remove_if(list.begin(), list.end(),
                              [&mentions](const Candidate& c) {
                                return c.rank == 2 && ++mentions > kOccurrenceDocuments;
                              }),
               list.end());
    for (Candidate& c : list) {
      std::sort(c.pages.begin(), c.pages.end());
      c.pages.erase(std::unique(c.pages.begin(), c.pages.end()), c.pages.end());
      c.pages.erase(std::remove_if(c.pages.begin(), c.pages.end(),
                                   [](int p) { return p < 1 || p > kMaxIndexPage; }),
                    c.pages.end());
    }
  }
  return words;
}

std::string IniText(const std::vector<Document>& documents) {
  std::string text =
      "; Docuvane settings written by docuvane-mkindex --scan.  The catalogue\n"
      "; lists every document of the word index; it is rewritten by each scan.\n"
      "\n[Setup]\nTrace=0\nRoot=\n\n[DOC]\n\n[Extensions]\n"
      "; Opening templates by file extension; without one the desktop's default\n"
      "; application opens the document.  PDF documents open at their page\n"
      "; through the launcher (see docuvane-open(1) for choosing the viewer).\n"
      "pdf=<docuvane-open>{ #} ^.pdf\n"
      "\n[Titles]\n; The documents' own titles, shown beside their names.\n";
  for (const Document& d : documents) {
    // A title is one line; quotes around it would be taken off by the reader.
    std::string title;
    for (char c : d.words.title) title += (c == '\n' || c == '\r' || c == '\t') ? ' ' : c;
    while (!title.empty() && title.back() == ' ') title.pop_back();
    if (!title.empty() && d.label.find('=') == std::string::npos && d.label[0] != ';' &&
        d.label[0] != '[')
      text += d.label + "=\"" + title + "\"\n";
  }
  return text;
}

std::string Describe(const IsolatedOutcome& outcome, int timeoutMs) {
  switch (outcome.status) {
    case IsolatedOutcome::Crashed:
      return "the PDF reader crashed on it (signal " + std::to_string(outcome.signal) + ")";
    case IsolatedOutcome::TimedOut:
      return "reading it took longer than " + std::to_string(timeoutMs / 1000) + " s";
    default:
      return "the PDF reader failed on it (out of memory?)";
  }
}

}  // namespace

ScanResult Scan_Documentation(const ScanOptions& options) {
  ScanResult result;
  auto warn = [&options](const std::string& text) {
    if (options.warn) options.warn(text);
  };
  const std::string& user = options.userTree;
  if (user.empty() || !MakeDirectories(user + "/Update") || !MakeDirectories(user + "/Docuvane")) {
    result.error = "cannot create the user's TeX tree " + user + " (not writable)";
    return result;
  }
  std::vector<std::string> trees;
  for (const std::string& tree : options.trees)
    if (tree != user && IsDirectory(tree)) trees.push_back(tree);

  std::vector<Document> documents = FindDocuments(trees);
  std::size_t pdfs = 0;
  for (const Document& d : documents) pdfs += d.pdf ? 1 : 0;
  if (pdfs == 0) {
    std::string where;
    for (const std::string& t : trees) where += (where.empty() ? "" : ", ") + t + "/doc";
    result.error = "no PDF documents found in " + (where.empty() ? std::string("any tree") : where);
    return result;
  }
  // Every document is a label of the index; the catalogue has room for as
  // many.  Cutting the list would hide documents without a word about it.
  if (documents.size() > static_cast<std::size_t>(kMaxLabels)) {
    result.error = std::to_string(documents.size()) +
                   " documents found, but the word index holds " + std::to_string(kMaxLabels) +
                   " at most; nothing was replaced";
    return result;
  }
  std::vector<Document> kept;
  for (Document& d : documents) {
    if (d.label.size() > kMaxIndexLabelLength)
      warn(d.path + ": skipped, its path below doc/ is longer than 255 bytes");
    else
      kept.push_back(std::move(d));
  }
  documents.swap(kept);
  result.documents = documents.size();

  const std::string cacheFile = user + "/" + kScanCacheFile;
  std::map<std::string, std::string> cache;
  if (!ReadCache(cacheFile, cache)) {
    warn(cacheFile + ": damaged, rebuilt from the documents");
    cache.clear();
  }
  std::vector<std::size_t> toRead;
  for (std::size_t i = 0; i < documents.size(); ++i) {
    Document& d = documents[i];
    if (!d.pdf) continue;
    auto hit = cache.find(CacheKey(d));
    if (hit != cache.end() && ParseDocumentWords(hit->second, d.words)) {
      d.known = true;
      ++result.cached;
    } else if (d.stamp.size > static_cast<std::int64_t>(options.largestFile)) {
      d.words.error = "larger than " + std::to_string(options.largestFile >> 20) + " MiB, not read";
      d.known = true;
    } else {
      toRead.push_back(i);
    }
  }

  // The largest documents first, so that no core is left waiting for one
  // at the end while the other is idle.
  std::stable_sort(toRead.begin(), toRead.end(), [&documents](std::size_t a, std::size_t b) {
    return documents[a].stamp.size > documents[b].stamp.size;
  });

  ScanProgress progress;
  progress.total = pdfs;
  progress.done = pdfs - toRead.size();
  if (options.progress && !options.progress(progress)) {
    result.error = "cancelled";
    return result;
  }
  IsolationLimits limits;
  limits.parallel = options.parallel;
  limits.timeoutMs = options.timeoutMs;
  limits.memoryBytes = options.memoryBytes;
  const auto start = std::chrono::steady_clock::now();
  std::size_t readSoFar = 0;
  const bool finished = RunIsolated(
      toRead.size(), limits,
      [&](std::size_t k) {
        return SerializeDocumentWords(ReadPdfWords(documents[toRead[k]].path));
      },
      [&](std::size_t k, IsolatedOutcome& outcome) {
        Document& d = documents[toRead[k]];
        if (outcome.status != IsolatedOutcome::Done ||
            !ParseDocumentWords(outcome.output, d.words)) {
          d.words = DocumentWords();
          d.words.error = Describe(outcome, options.timeoutMs);
        }
        d.known = true;
        ++readSoFar;
        ++progress.done;
        const double elapsed =
            std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
        progress.secondsLeft = static_cast<int>(elapsed / static_cast<double>(readSoFar) *
                                                    static_cast<double>(toRead.size() - readSoFar) +
                                                0.5);
        return !options.progress || options.progress(progress);
      });
  result.read = readSoFar;
  if (!finished) {
    result.error = "cancelled";
    return result;
  }
  for (const Document& d : documents)
    if (d.pdf && !d.words.error.empty()) {
      warn(d.path + ": skipped, " + d.words.error);
      ++result.skipped;
    }

  WordIndexBuilder builder;
  std::string error;
  // Labels are numbered in the order of their paths, so that the documents
  // of one directory follow each other in the catalogue and share its nodes.
  std::vector<std::string> labels;
  for (const Document& d : documents) labels.push_back(d.label);
  std::sort(labels.begin(), labels.end());
  for (const std::string& label : labels)
    if (!builder.AddLabel(label, error)) warn(label + ": " + error);
  const auto words = Locations(documents, FindPackages(trees));
  std::vector<bool> labelled(documents.size());
  for (const auto& [word, list] : words)
    for (const Candidate& c : list) {
      // Words holding '@' are the packages' own internals: the word list
      // never shows them, and each would be traced at every start.
      if (word.find('@') != std::string::npos) continue;
      if (c.pages.empty()) continue;
      if (!builder.Add(word, documents[c.document].label, c.pages, error)) {
        warn(documents[c.document].path + ": " + word + ": " + error);
        continue;
      }
      labelled[c.document] = true;
    }
  for (std::size_t i = 0; i < documents.size(); ++i)
    if (!labelled[i]) warn(documents[i].path + ": has no word and is not in the catalogue");
  std::vector<std::uint8_t> bytes;
  if (!builder.Build(WordIndexBuilder::Form::Compact, bytes, error)) {
    result.error = "cannot lay out the word index: " + error;
    return result;
  }
  const std::string indexFile = user + "/" + kScanIndexFile;
  if (!ReplaceFile(indexFile, std::string(bytes.begin(), bytes.end()), 0644) ||
      !ReplaceFile(user + "/" + kScanIniFile, IniText(documents), 0644)) {
    result.error = "cannot write " + indexFile + " (user's TeX tree not writable)";
    return result;
  }
  if (!ReplaceFile(cacheFile, CacheText(documents), 0644))
    warn(cacheFile + ": cannot be written; the next scan reads every document again");
  result.words = builder.WordCount();
  result.indexBytes = bytes.size();
  result.ok = true;
  return result;
}
