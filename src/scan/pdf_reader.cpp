// PDF text, links and page labels through poppler-glib.
#include "scan/pdf_reader.h"

#include <poppler.h>

#include <algorithm>
#include <map>

#include "scan/words.h"

namespace {

// A page with this many understood index links is a page of the printed
// index: what it mentions is not counted as occurrences.
constexpr int kIndexPageLinks = 5;
// A page without index links is a page of a printed index from this many
// lines that read like index entries on.
constexpr std::size_t kIndexPageLines = 8;
// Ranges of pages ("19–21") longer than this are taken for their ends only.
constexpr int kLongestRange = 20;
// Destinations looked up one by one before all are read at once.
constexpr std::size_t kSingleLookups = 200;
// Links are read on pages with at least this many lines like index entries.
constexpr std::size_t kLinkedIndexLines = 2;
// How far up a continued page list looks for its entry's head.
constexpr int kContinuationLines = 3;

struct TextPosition {
  std::string text;
  std::vector<std::size_t> charStart;  // byte offset of each character
  PopplerRectangle* rects = nullptr;
  guint rectCount = 0;
  // Characters by the height of their middle, to find those of a link's
  // area without going through the whole page for each link.
  std::vector<std::pair<double, std::size_t>> byHeight;
};

void SplitCharacters(TextPosition& t) {
  for (std::size_t i = 0; i < t.text.size(); ++i)
    if ((static_cast<unsigned char>(t.text[i]) & 0xC0) != 0x80) t.charStart.push_back(i);
}

std::string Trimmed(const std::string& s) {
  std::size_t b = 0, e = s.size();
  while (b < e && (s[b] == ' ' || s[b] == '\n')) ++b;
  while (e > b && (s[e - 1] == ' ' || s[e - 1] == '\n')) --e;
  return s.substr(b, e - b);
}

// False for a link that cannot be a page reference whatever its
// destination: a "page.N" destination fits only the number N.
bool MayLeadToPage(PopplerAction* action, const std::string& number) {
  if (action->type != POPPLER_ACTION_GOTO_DEST || !action->goto_dest.dest) return false;
  const PopplerDest* dest = action->goto_dest.dest;
  if (dest->type != POPPLER_DEST_NAMED || !dest->named_dest) return true;
  const std::string name = dest->named_dest;
  return name.compare(0, 5, "page.") != 0 || name.substr(5) == number;
}

bool IsNumber(const std::string& s) {
  if (s.empty() || s.size() > 6) return false;
  for (char c : s)
    if (c < '0' || c > '9') return false;
  return true;
}

// The head word of the index entry whose page number starts at byte `at`.
std::string HeadBefore(const std::string& text, std::size_t at) {
  std::size_t lineBegin = text.rfind('\n', at == 0 ? 0 : at - 1);
  lineBegin = lineBegin == std::string::npos ? 0 : lineBegin + 1;
  std::string head = IndexEntryHead(text.substr(lineBegin, at - lineBegin));
  if (!head.empty() || !IsPageListFiller(text.substr(lineBegin, at - lineBegin))) return head;
  // A page list continued from the line above.
  for (int up = 0; up < kContinuationLines && lineBegin > 0; ++up) {
    const std::size_t lineEnd = lineBegin - 1;
    std::size_t begin = lineEnd == 0 ? std::string::npos : text.rfind('\n', lineEnd - 1);
    begin = begin == std::string::npos ? 0 : begin + 1;
    const std::string line = text.substr(begin, lineEnd - begin);
    head = IndexEntryHead(line);
    if (!head.empty() || !IsPageListFiller(line)) return head;
    lineBegin = begin;
  }
  return std::string();
}

// The lines of a page that read like entries of a printed index (a head
// word, then its page numbers), with the numbers; a line of nothing but
// numbers goes on the entry above it.  "19–21" stands for 19, 20 and 21.
struct IndexLine {
  std::string head;
  std::vector<int> numbers;
};

std::vector<IndexLine> IndexLines(const std::string& text) {
  std::vector<IndexLine> lines;
  std::size_t begin = 0;
  while (begin < text.size()) {
    std::size_t end = text.find('\n', begin);
    if (end == std::string::npos) end = text.size();
    const std::string line = text.substr(begin, end - begin);
    begin = end + 1;
    const std::size_t digit = line.find_first_of("0123456789");
    if (digit == std::string::npos) continue;
    std::string head = IndexEntryHead(line.substr(0, digit));
    if (head.empty()) {
      if (lines.empty() || !IsPageListFiller(line)) continue;
      head = lines.back().head;
    } else if (!IsPageListFiller(line.substr(digit))) {
      continue;
    }
    IndexLine entry{head, {}};
    bool range = false;
    for (std::size_t i = digit; i < line.size();) {
      if (line[i] >= '0' && line[i] <= '9') {
        std::size_t j = i;
        while (j < line.size() && line[j] >= '0' && line[j] <= '9') ++j;
        if (j - i > 5) break;
        const int number = std::stoi(line.substr(i, j - i));
        if (range && !entry.numbers.empty() && number > entry.numbers.back() &&
            number - entry.numbers.back() < kLongestRange)
          for (int n = entry.numbers.back() + 1; n < number; ++n) entry.numbers.push_back(n);
        entry.numbers.push_back(number);
        range = false;
        i = j;
      } else {
        // A hyphen or an en dash (U+2013) joins the ends of a range.
        if (line[i] == '-' || line.compare(i, 3, "\xE2\x80\x93") == 0) range = true;
        if (line[i] == ',') range = false;
        ++i;
      }
    }
    if (lines.empty() || lines.back().head != head)
      lines.push_back(entry);
    else
      lines.back().numbers.insert(lines.back().numbers.end(), entry.numbers.begin(),
                                  entry.numbers.end());
  }
  return lines;
}

class Reader {
 public:
  explicit Reader(PopplerDocument* doc) : doc_(doc), pages_(poppler_document_get_n_pages(doc)) {}
  ~Reader() {
    if (destinations_) g_tree_destroy(destinations_);
  }
  Reader(const Reader&) = delete;
  Reader& operator=(const Reader&) = delete;

  int Pages() const { return pages_; }

  // The printed label of physical page `page` (from 1).
  const std::string& Label(int page) {
    auto found = labels_.find(page);
    if (found != labels_.end()) return found->second;
    std::string label;
    if (PopplerPage* p = poppler_document_get_page(doc_, page - 1)) {
      gchar* text = poppler_page_get_label(p);
      if (text) label = text;
      g_free(text);
      g_object_unref(p);
    }
    return labels_[page] = label;
  }

  // Physical page (from 1) a link leads to, and the name of its
  // destination when it has one; 0 when it leads nowhere in the document.
  // A name looked up alone is fetched from the file again each time; all
  // names read in one pass cost about as much as a few hundred lookups, so
  // that is done once the document has needed that many.
  int Target(PopplerAction* action, std::string& name) {
    if (action->type != POPPLER_ACTION_GOTO_DEST || !action->goto_dest.dest) return 0;
    PopplerDest* dest = action->goto_dest.dest;
    if (dest->type != POPPLER_DEST_NAMED) return dest->page_num;
    if (!dest->named_dest) return 0;
    name = dest->named_dest;
    auto known = looked_up_.find(name);
    if (known != looked_up_.end()) return known->second;
    int page = 0;
    if (!destinations_ && looked_up_.size() >= kSingleLookups)
      destinations_ = poppler_document_create_dests_tree(doc_);
    if (destinations_) {
      auto* found = static_cast<PopplerDest*>(g_tree_lookup(destinations_, dest->named_dest));
      page = found ? found->page_num : 0;
    } else if (PopplerDest* found = poppler_document_find_dest(doc_, dest->named_dest)) {
      page = found->page_num;
      poppler_dest_free(found);
    }
    return looked_up_[name] = page;
  }

  void ReadPage(int index, DocumentWords& words,
                std::map<std::string, std::vector<PageCount>>& all) {
    PopplerPage* page = poppler_document_get_page(doc_, index);
    if (!page) return;
    TextPosition t;
    gchar* text = poppler_page_get_text(page);
    t.text = text ? text : "";
    g_free(text);
    // Links are read only where a line looks like an index entry: most
    // pages have none, and reading their annotations costs time.
    std::vector<IndexLine> lines = IndexLines(t.text);
    const int pageLinks = lines.size() < kLinkedIndexLines ? 0 : ReadIndexLinks(page, t, words);
    // A page of a printed index without links: its numbers are printed
    // page labels, resolved when the whole text is known.
    const bool printedIndex = pageLinks == 0 && lines.size() >= kIndexPageLines;
    if (printedIndex) {
      // The index of documented code: most of its numbers are code lines.
      if (t.text.find("code line") != std::string::npos) codeLineIndex_ = true;
      for (IndexLine& line : lines) printed_.push_back(std::move(line));
    }
    if (pageLinks < kIndexPageLinks && !printedIndex) {
      std::map<std::string, int> counts;
      std::vector<bool> described;
      const std::vector<std::string> found = WordsOfText(t.text, &described);
      for (std::size_t k = 0; k < found.size(); ++k)
        if (IsUsableWord(found[k])) counts[found[k]] += described[k] ? kDescribedWeight : 1;
      for (const auto& [word, count] : counts) all[word].push_back(PageCount{index + 1, count});
    }
    g_free(t.rects);
    g_object_unref(page);
  }

  // The entries of a printed index without links: a number is the label
  // of a page, and counts where that page, or one beside it (some indexes
  // are off by one), shows the word.
  void ResolvePrintedIndex(DocumentWords& words,
                           const std::map<std::string, std::vector<PageCount>>& all) {
    if (printed_.empty() || codeLineIndex_) return;
    // Numbers beyond the last page say the same as "code line" does.
    std::size_t numbers = 0, beyond = 0;
    for (const IndexLine& line : printed_)
      for (int number : line.numbers) {
        ++numbers;
        beyond += number > pages_ ? 1 : 0;
      }
    if (beyond * 10 > numbers) return;
    std::map<std::string, int> physical;
    for (int page = pages_; page >= 1; --page) physical[Label(page)] = page;
    for (const IndexLine& line : printed_) {
      if (!IsUsableWord(line.head)) continue;
      auto found = all.find(line.head);
      if (found == all.end()) continue;
      auto shows = [&found](int page) {
        for (const PageCount& p : found->second)
          if (p.page == page) return true;
        return false;
      };
      for (int number : line.numbers) {
        auto at = physical.find(std::to_string(number));
        if (at == physical.end()) continue;
        for (int page : {at->second, at->second + 1, at->second - 1})
          if (shows(page)) {
            words.indexed[line.head].push_back(page);
            ++words.indexLinks;
            break;
          }
      }
    }
  }

 private:
  int ReadIndexLinks(PopplerPage* page, TextPosition& t, DocumentWords& words) {
    GList* mapping = poppler_page_get_link_mapping(page);
    if (!mapping) return 0;
    struct Found {
      std::size_t from, to;  // bytes of the number in the page's text
      std::string head;
      int page;
    };
    std::vector<Found> found;
    double width = 0, height = 0;
    poppler_page_get_size(page, &width, &height);
    bool haveLayout = false;
    const bool labelled = Label(1) != "1";
    for (GList* item = mapping; item; item = item->next) {
      auto* link = static_cast<PopplerLinkMapping*>(item->data);
      if (link->action->type != POPPLER_ACTION_GOTO_DEST) continue;
      if (!haveLayout) {
        haveLayout = true;
        if (!poppler_page_get_text_layout(page, &t.rects, &t.rectCount)) t.rects = nullptr;
        SplitCharacters(t);
        const std::size_t n = t.rects ? std::min<std::size_t>(t.rectCount, t.charStart.size()) : 0;
        for (std::size_t c = 0; c < n; ++c)
          t.byHeight.emplace_back((t.rects[c].y1 + t.rects[c].y2) / 2, c);
        std::sort(t.byHeight.begin(), t.byHeight.end());
      }
      // Link areas count from the bottom of the page, text from the top.
      const double top = height - link->area.y2, bottom = height - link->area.y1;
      std::size_t first = t.charStart.size(), last = 0;
      const std::size_t n = t.byHeight.size();
      for (auto c = std::lower_bound(t.byHeight.begin(), t.byHeight.end(),
                                     std::make_pair(top, std::size_t{0}));
           c != t.byHeight.end() && c->first <= bottom; ++c) {
        const PopplerRectangle& r = t.rects[c->second];
        const double x = (r.x1 + r.x2) / 2;
        if (x >= link->area.x1 && x <= link->area.x2) {
          first = std::min(first, c->second);
          last = std::max(last, c->second);
        }
      }
      if (first >= n) continue;
      const std::size_t from = t.charStart[first];
      const std::size_t to = last + 1 < t.charStart.size() ? t.charStart[last + 1] : t.text.size();
      const std::string number = Trimmed(t.text.substr(from, to - from));
      // A page reference, not a code line number or a section number: the
      // text is the printed label of the page it leads to.
      if (!IsNumber(number)) continue;
      if (!MayLeadToPage(link->action, number)) continue;
      // In a document whose pages have no labels of their own, a number
      // beyond the last page is a code line: no need to look it up.
      if (!labelled && std::stoi(number) > pages_) continue;
      std::string name;
      const int target = Target(link->action, name);
      if (target < 1 || target > pages_) continue;
      if (Label(target) != number && name != "page." + number) continue;
      const std::string head = HeadBefore(t.text, from);
      if (head.empty() || !IsUsableWord(head)) continue;
      found.push_back(Found{from, to, head, target});
    }
    poppler_page_free_link_mapping(mapping);
    // "19–21" links its two ends: the pages between belong to the entry too.
    std::sort(found.begin(), found.end(),
              [](const Found& a, const Found& b) { return a.from < b.from; });
    for (std::size_t k = 0; k < found.size(); ++k) {
      const Found& f = found[k];
      std::vector<int>& pages = words.indexed[f.head];
      if (k > 0 && found[k - 1].head == f.head && f.from > found[k - 1].to &&
          f.page > found[k - 1].page && f.page - found[k - 1].page < kLongestRange) {
        const std::string between =
            Trimmed(t.text.substr(found[k - 1].to, f.from - found[k - 1].to));
        if (between == "-" || between == "\xE2\x80\x93" || between == "--")
          for (int page = found[k - 1].page + 1; page < f.page; ++page) pages.push_back(page);
      }
      pages.push_back(f.page);
    }
    const int understood = static_cast<int>(found.size());
    words.indexLinks += understood;
    return understood;
  }

  PopplerDocument* doc_;
  int pages_;
  std::map<int, std::string> labels_;
  GTree* destinations_ = nullptr;
  std::map<std::string, int> looked_up_;
  std::vector<IndexLine> printed_;
  bool codeLineIndex_ = false;
};

}  // namespace

DocumentWords ReadPdfWords(const std::string& path) {
  DocumentWords words;
  GError* error = nullptr;
  // Opened from the mapped file: poppler reads a file it opens itself a few
  // hundred bytes at a time, a system call each, which costs about a tenth
  // of the time it takes to read the whole text.
  GMappedFile* mapped = g_mapped_file_new(path.c_str(), FALSE, &error);
  GBytes* bytes = mapped ? g_mapped_file_get_bytes(mapped) : nullptr;
  if (mapped) g_mapped_file_unref(mapped);
  PopplerDocument* doc = bytes ? poppler_document_new_from_bytes(bytes, nullptr, &error) : nullptr;
  if (bytes) g_bytes_unref(bytes);
  if (!doc) {
    if (error && error->domain == POPPLER_ERROR && error->code == POPPLER_ERROR_ENCRYPTED)
      words.error = "encrypted, needs a password";
    else
      words.error =
          std::string("not a readable PDF") + (error ? ": " + std::string(error->message) : "");
    if (error) g_error_free(error);
    return words;
  }
  gchar* title = poppler_document_get_title(doc);
  if (title) words.title = title;
  g_free(title);

  Reader reader(doc);
  words.pages = reader.Pages();
  std::map<std::string, std::vector<PageCount>> all;
  for (int i = 0; i < reader.Pages(); ++i) reader.ReadPage(i, words, all);
  reader.ResolvePrintedIndex(words, all);

  for (auto& [word, pages] : words.indexed) {
    std::sort(pages.begin(), pages.end());
    pages.erase(std::unique(pages.begin(), pages.end()), pages.end());
  }
  for (auto& [word, pages] : all) {
    if (words.indexed.count(word)) continue;
    int total = 0;
    for (const PageCount& p : pages) total += p.count;
    std::stable_sort(pages.begin(), pages.end(),
                     [](const PageCount& a, const PageCount& b) { return a.count > b.count; });
    if (pages.size() > kKeptPagesPerWord) pages.resize(kKeptPagesPerWord);
    words.totals[word] = total;
    words.occurs[word] = pages;
  }
  g_object_unref(doc);
  return words;
}
