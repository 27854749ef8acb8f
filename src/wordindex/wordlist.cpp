// The words of the index as the word list shows them.
#include "wordindex/wordlist.h"

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <future>
#include <memory>
#include <utility>

#include "base/trace.h"
#include "platform/winapi.h"
#include "text/text.h"
#include "trovlib/trovlib.h"
#include "wordindex/wordindex.h"

int CommandWordCount = 0;
int EnvironmentWordCount = 0;

namespace {

inline const char* DropLead(const char* w) { return (*w == '\\' || *w == '{') ? w + 1 : w; }

// True when the first n bytes of `word` equal `text` ignoring case (and
// `word` is at least that long).
bool StartsWithFolded(const char* word, const char* text, std::size_t n) {
  for (std::size_t i = 0; i < n; ++i) {
    const unsigned char w = static_cast<unsigned char>(word[i]);
    if (w == 0) return false;
    if (FoldCase(w) != FoldCase(static_cast<unsigned char>(text[i]))) return false;
  }
  return true;
}

}  // namespace

int CompareIndexWords(const char* a, const char* b) {
  return CompareIgnoringCase(DropLead(a), DropLead(b));
}

void SortIndexWords(std::vector<const char*>& words) {
  // Sorted on the first eight folded bytes of each word without its mark,
  // read as one big-endian number, so that most comparisons are one integer
  // comparison in a compact array; only equal leads fall back to the words
  // themselves, from their ninth byte.  A word shorter than eight bytes is
  // padded with zeros, which order it before every longer word of the same
  // lead, as the byte comparison does.
  struct Keyed {
    std::uint64_t lead;
    const char* word;
  };
  std::vector<Keyed> keyed;
  keyed.reserve(words.size());
  for (const char* word : words) {
    const unsigned char* w = reinterpret_cast<const unsigned char*>(DropLead(word));
    std::uint64_t lead = 0;
    int i = 0;
    for (; i < 8 && w[i] != 0; ++i) lead = (lead << 8) | FoldCase(w[i]);
    lead <<= 8 * (8 - i);
    keyed.push_back({lead, word});
  }
  // By the leads first, sixteen bits at a time from the lowest (a radix
  // sort: a few passes over the array instead of some twenty comparisons
  // per word), keeping the order of equal leads...
  std::vector<Keyed> moved(keyed.size());
  std::vector<std::size_t> start(std::size_t{1} << 16);
  for (int shift = 0; shift < 64 && keyed.size() > 1; shift += 16) {
    std::fill(start.begin(), start.end(), 0);
    for (const Keyed& k : keyed) ++start[(k.lead >> shift) & 0xFFFF];
    if (start[(keyed.front().lead >> shift) & 0xFFFF] == keyed.size()) continue;  // all alike
    std::size_t at = 0;
    for (std::size_t& s : start) at += std::exchange(s, at);
    for (const Keyed& k : keyed) moved[start[(k.lead >> shift) & 0xFFFF]++] = k;
    keyed.swap(moved);
  }
  // ...then the words that share all eight lead bytes by the rest of them.
  for (std::size_t i = 0; i < keyed.size();) {
    std::size_t j = i + 1;
    while (j < keyed.size() && keyed[j].lead == keyed[i].lead) ++j;
    if (j - i > 1 && (keyed[i].lead & 0xFF) != 0)
      std::stable_sort(keyed.begin() + static_cast<std::ptrdiff_t>(i),
                       keyed.begin() + static_cast<std::ptrdiff_t>(j),
                       [](const Keyed& a, const Keyed& b) {
                         return CompareIgnoringCase(DropLead(a.word) + 8, DropLead(b.word) + 8) < 0;
                       });
    i = j;
  }
  for (std::size_t i = 0; i < keyed.size(); ++i) words[i] = keyed[i].word;
}

int Fill_WordIndex(WordListData& data, bool sortInBackground) {
  const DWORD start = GetTickCount();
  data.Wait();
  data.Words.clear();
  data.RecordBuffer.reset();
  CommandWordCount = 0;
  EnvironmentWordCount = 0;
  if (WordIndexHandle == nullptr) return 0;

  // The header checks guarantee min..max+1 offsets that rise and stay
  // inside the file, so the area is sized by the file itself.
  const int32_t areaStart = LengthOffsets[MinWordLength];
  const int32_t areaEnd = LengthOffsets[MaxWordLength + 1];
  const std::size_t areaSize = static_cast<std::size_t>(areaEnd - areaStart);
  data.RecordBuffer.reset(new char[areaSize + 1]);
  if (!ReadIndexBytes(areaStart, data.RecordBuffer.get(), areaSize)) {
    data.RecordBuffer.reset();
    TraceMessage("ERROR: Can't read the word records of Word Index file: ", nullptr);
    return 0;
  }
  data.RecordBuffer[areaSize] = '\0';

  std::size_t records = 0;
  for (int L = MinWordLength; L <= MaxWordLength; ++L)
    records += static_cast<std::size_t>(LengthOffsets[L + 1] - LengthOffsets[L]) / (L + 5);
  data.Words.reserve(records);

  char* area = data.RecordBuffer.get();
  for (int L = MinWordLength; L <= MaxWordLength; ++L) {
    const std::size_t size = static_cast<std::size_t>(L) + 5;
    const std::size_t count =
        static_cast<std::size_t>(LengthOffsets[L + 1] - LengthOffsets[L]) / size;
    char* record = area + (LengthOffsets[L] - areaStart);
    for (std::size_t i = 0; i < count; ++i, record += size) {
      record[L] = '\0';
      if (strchr(record, '@') != nullptr) {
        TraceMessage("WARNING: Skipped index word: ", record);
        continue;
      }
      data.Words.push_back(record);
      if (record[0] == '\\')
        ++CommandWordCount;
      else if (record[0] == '{')
        ++EnvironmentWordCount;
    }
  }

  if (sortInBackground) {
    // Nothing else touches the words until Wait(); the record buffer stays
    // where it is while the vector is sorted.
    std::vector<const char*>* words = &data.Words;
    data.Sorting = std::async(std::launch::async, [words] { SortIndexWords(*words); });
  } else {
    SortIndexWords(data.Words);
  }

  char elapsed[32];
  snprintf(elapsed, sizeof elapsed, "%d ms", static_cast<int>(GetTickCount() - start));
  TraceMessage("QListBox::Fill_WordIndex Time: ", elapsed);
  return 1;
}

namespace {

struct StartedFill {
  std::shared_ptr<WordListData> data;  // its sort may still run
  std::vector<TrovHeldMessage> held;
  int count = 0;
};

std::future<StartedFill> g_started;

}  // namespace

void Start_Fill_WordIndex() {
  if (g_started.valid()) return;
  g_started = std::async(std::launch::async, [] {
    StartedFill fill;
    fill.data = std::make_shared<WordListData>();
    TrovHoldMessages(&fill.held);
    Fill_WordIndex(*fill.data, true);
    TrovHoldMessages(nullptr);
    fill.count = static_cast<int>(fill.data->Words.size());
    return fill;
  });
}

int Take_Started_Fill(WordListData& data) {
  if (!g_started.valid()) return -1;
  StartedFill fill = g_started.get();
  TrovReplayMessages(fill.held);
  data.Wait();
  data.Words.clear();
  data.RecordBuffer.reset();
  // The words move over once their sort has ended, on the first Wait().
  std::shared_ptr<WordListData> source = fill.data;
  data.Sorting = std::async(std::launch::deferred, [&data, source] {
    source->Wait();
    data.Words = std::move(source->Words);
    data.RecordBuffer = std::move(source->RecordBuffer);
  });
  return fill.count;
}

void Drop_Started_Fill() {
  if (g_started.valid()) g_started.get().data->Wait();
}

int FindWordInList(const std::vector<const char*>& words, const char* text, int exact) {
  if (text == nullptr) return -1;
  // A text that begins with a backslash or a brace asks for exactly that
  // kind of word; otherwise the kinds are looked through.
  const bool whole = (*text == '\\' || *text == '{');
  const std::size_t n = strlen(text);
  // The list is sorted on the words without their mark, so every word whose
  // unmarked part starts with the text's unmarked part stands in one run;
  // the first row of that run is found by bisection.
  const char* key = DropLead(text);
  const std::size_t keyLength = strlen(key);
  const auto begin = std::partition_point(words.begin(), words.end(), [&](const char* word) {
    const unsigned char* w = reinterpret_cast<const unsigned char*>(DropLead(word));
    const unsigned char* k = reinterpret_cast<const unsigned char*>(key);
    for (std::size_t i = 0; i < keyLength; ++i) {
      const unsigned char cw = FoldCase(w[i]);
      const unsigned char ck = FoldCase(k[i]);
      if (cw != ck) return cw < ck;  // a word that ends here is smaller too
    }
    return false;  // the word starts with the key: the run begins at or before it
  });
  int first = -1;
  for (auto it = begin; it != words.end(); ++it) {
    if (!StartsWithFolded(DropLead(*it), key, keyLength)) break;  // past the run
    const char* word = whole ? *it : DropLead(*it);
    if (!StartsWithFolded(word, text, n)) continue;
    const int row = static_cast<int>(it - words.begin());
    if (!exact) return row;
    if (strcmp(word, text) == 0) return row;
    if (first == -1) first = row;
  }
  return first;
}
