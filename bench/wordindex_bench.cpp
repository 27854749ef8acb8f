// The word index with 200,000 words: opening it and looking words up, and
// filling the word list, against the floor of a plain sort of the same
// words with the same comparison.
#include <benchmark/benchmark.h>

#include <algorithm>
#include <cstdint>
#include <fstream>
#include <string>
#include <vector>

#include "test_support.h"
#include "trovlib/trovlib.h"
#include "wordindex/index_writer.h"
#include "wordindex/wordindex.h"
#include "wordindex/wordlist.h"

namespace {

constexpr int kWords = 200000;
constexpr int kLookups = 1000;

// Commands, environments and plain words of 3 to 24 bytes; a handful hold
// '@' so that the skip is exercised without flooding the trace.
struct Fixture {
  testing_support::TempDir dir;
  std::string path;
  std::vector<std::string> words;   // as stored, in file order
  std::vector<std::string> listed;  // the words the list keeps
  Fixture() {
    uint64_t state = 0x9E3779B97F4A7C15ull;
    auto next = [&state] {
      state ^= state << 13;
      state ^= state >> 7;
      state ^= state << 17;
      return state;
    };
    WordIndexBuilder builder;
    std::string error;
    std::vector<std::string> labels;
    for (int i = 0; i < 400; ++i) labels.push_back("latex/pkg" + std::to_string(i) + "/doc.pdf");
    int made = 0;
    while (made < kWords) {
      std::string word;
      const uint64_t kind = next() % 10;
      if (kind < 6)
        word = "\\";
      else if (kind < 8)
        word = "{";
      const int length = 2 + static_cast<int>(next() % 20);
      for (int i = 0; i < length; ++i) {
        const uint64_t r = next() % 60;
        word += static_cast<char>(r < 26 ? 'a' + r : r < 52 ? 'A' + (r - 26) : '0' + (r - 52));
      }
      if (kind >= 6 && kind < 8) word += "}";
      if (made % 40000 == 7) word.insert(1, "@");
      std::vector<int> pages = {static_cast<int>(next() % 500), static_cast<int>(next() % 500)};
      if (!builder.Add(word, labels[next() % labels.size()], pages, error)) std::abort();
      made = static_cast<int>(builder.WordCount());
    }
    std::vector<uint8_t> bytes;
    if (!builder.Build(WordIndexBuilder::Form::Compact, bytes, error)) std::abort();
    path = dir / "command.Index";
    std::ofstream(path, std::ios::binary)
        .write(reinterpret_cast<const char*>(bytes.data()),
               static_cast<std::streamsize>(bytes.size()));
    if (!OpenWordIndex(path.c_str())) std::abort();
    for (int L = MinWordLength; L <= MaxWordLength; ++L) {
      const int64_t count = (LengthOffsets[L + 1] - LengthOffsets[L]) / (L + 5);
      for (int64_t i = 0; i < count; ++i) {
        std::string word(static_cast<std::size_t>(L), '\0');
        ReadIndexBytes(LengthOffsets[L] + i * (L + 5), &word[0], word.size());
        words.push_back(word);
        if (word.find('@') == std::string::npos) listed.push_back(word);
      }
    }
    CloseWordIndex();
  }
};

Fixture& TheFixture() {
  static Fixture fixture;
  return fixture;
}

// Messages are not what is measured.
void Quiet() {
  TrovSetMessageSink([](const char*, const char*, int) {});
}

void BM_OpenAndLookup1000(benchmark::State& state) {
  Fixture& f = TheFixture();
  Quiet();
  std::vector<const char*> probes;
  for (int i = 0; i < kLookups; ++i)
    probes.push_back(f.words[(i * 7919u) % f.words.size()].c_str());
  for (auto _ : state) {
    if (!OpenWordIndex(f.path.c_str())) state.SkipWithError("open failed");
    int found = 0;
    for (const char* word : probes) found += FindIndexWord(word) != 0;
    if (found != kLookups) state.SkipWithError("a word was not found");
    CloseWordIndex();
  }
}
BENCHMARK(BM_OpenAndLookup1000)->Unit(benchmark::kMillisecond);

void BM_FillWordIndex(benchmark::State& state) {
  Fixture& f = TheFixture();
  Quiet();
  OpenWordIndex(f.path.c_str());
  for (auto _ : state) {
    WordListData data;
    Fill_WordIndex(data);
    if (data.Words.size() != f.listed.size()) state.SkipWithError("wrong word count");
    benchmark::DoNotOptimize(data.Words.data());
  }
  CloseWordIndex();
}
BENCHMARK(BM_FillWordIndex)->Unit(benchmark::kMillisecond);

// The floor: the same words, already in memory and in file order, sorted
// with the same comparison.
void BM_SortFloor(benchmark::State& state) {
  Fixture& f = TheFixture();
  std::vector<const char*> order;
  for (const std::string& word : f.listed) order.push_back(word.c_str());
  for (auto _ : state) {
    std::vector<const char*> words = order;
    std::sort(words.begin(), words.end(),
              [](const char* a, const char* b) { return CompareIndexWords(a, b) < 0; });
    benchmark::DoNotOptimize(words.data());
  }
}
BENCHMARK(BM_SortFloor)->Unit(benchmark::kMillisecond);

}  // namespace

BENCHMARK_MAIN();
