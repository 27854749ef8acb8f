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
// How far up a continued page list looks for its entry's head.
constexpr int kContinuationLines = 3;

struct TextPosition {
  std::string text;
  std::vector<std::size_t> charStart;  // byte offset of each character
  PopplerRectangle* rects = nullptr;
  guint rectCount = 0;
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

// True when some line of the page reads like an entry of a printed index:
// a head word and a page number after it.
bool HasIndexLine(const std::string& text) {
  std::size_t begin = 0;
  while (begin < text.size()) {
    std::size_t end = text.find('\n', begin);
    if (end == std::string::npos) end = text.size();
    for (std::size_t i = begin; i < end; ++i)
      if (text[i] >= '0' && text[i] <= '9') {
        if (!IndexEntryHead(text.substr(begin, i - begin)).empty()) return true;
        break;
      }
    begin = end + 1;
  }
  return false;
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
  // Looking names up one by one fetches each from the file again; all of
  // them read in one pass cost less than a few hundred lookups.
  int Target(PopplerAction* action, std::string& name) {
    if (action->type != POPPLER_ACTION_GOTO_DEST || !action->goto_dest.dest) return 0;
    PopplerDest* dest = action->goto_dest.dest;
    if (dest->type != POPPLER_DEST_NAMED) return dest->page_num;
    if (!dest->named_dest) return 0;
    name = dest->named_dest;
    if (!destinations_) destinations_ = poppler_document_create_dests_tree(doc_);
    if (!destinations_) return 0;
    auto* found = static_cast<PopplerDest*>(g_tree_lookup(destinations_, dest->named_dest));
    return found ? found->page_num : 0;
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
    const int pageLinks = HasIndexLine(t.text) ? ReadIndexLinks(page, t, words) : 0;
    if (pageLinks < kIndexPageLinks) {
      std::map<std::string, int> counts;
      for (const std::string& word : WordsOfText(t.text))
        if (IsUsableWord(word)) ++counts[word];
      for (const auto& [word, count] : counts) all[word].push_back(PageCount{index + 1, count});
    }
    g_free(t.rects);
    g_object_unref(page);
  }

 private:
  int ReadIndexLinks(PopplerPage* page, TextPosition& t, DocumentWords& words) {
    GList* mapping = poppler_page_get_link_mapping(page);
    if (!mapping) return 0;
    int understood = 0;
    double width = 0, height = 0;
    poppler_page_get_size(page, &width, &height);
    bool haveLayout = false;
    for (GList* item = mapping; item; item = item->next) {
      auto* link = static_cast<PopplerLinkMapping*>(item->data);
      if (link->action->type != POPPLER_ACTION_GOTO_DEST) continue;
      if (!haveLayout) {
        haveLayout = true;
        if (!poppler_page_get_text_layout(page, &t.rects, &t.rectCount)) t.rects = nullptr;
        SplitCharacters(t);
      }
      // Link areas count from the bottom of the page, text from the top.
      const double top = height - link->area.y2, bottom = height - link->area.y1;
      std::size_t first = t.charStart.size(), last = 0;
      const std::size_t n = std::min<std::size_t>(t.rectCount, t.charStart.size());
      for (std::size_t c = 0; c < n; ++c) {
        const PopplerRectangle& r = t.rects[c];
        const double x = (r.x1 + r.x2) / 2, y = (r.y1 + r.y2) / 2;
        if (x >= link->area.x1 && x <= link->area.x2 && y >= top && y <= bottom) {
          first = std::min(first, c);
          last = std::max(last, c);
        }
      }
      if (first >= n) continue;
      const std::size_t from = t.charStart[first];
      const std::size_t to = last + 1 < t.charStart.size() ? t.charStart[last + 1] : t.text.size();
      const std::string number = Trimmed(t.text.substr(from, to - from));
      // A page reference, not a code line number or a section number: the
      // text is the printed label of the page it leads to.
      if (!IsNumber(number)) continue;
      std::string name;
      const int target = Target(link->action, name);
      if (target < 1 || target > pages_) continue;
      if (Label(target) != number && name != "page." + number) continue;
      const std::string head = HeadBefore(t.text, from);
      if (head.empty() || !IsUsableWord(head)) continue;
      words.indexed[head].push_back(target);
      ++understood;
    }
    poppler_page_free_link_mapping(mapping);
    words.indexLinks += understood;
    return understood;
  }

  PopplerDocument* doc_;
  int pages_;
  std::map<int, std::string> labels_;
  GTree* destinations_ = nullptr;
};

}  // namespace

DocumentWords ReadPdfWords(const std::string& path) {
  DocumentWords words;
  GError* error = nullptr;
  gchar* uri = g_filename_to_uri(path.c_str(), nullptr, &error);
  PopplerDocument* doc = uri ? poppler_document_new_from_file(uri, nullptr, &error) : nullptr;
  g_free(uri);
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
