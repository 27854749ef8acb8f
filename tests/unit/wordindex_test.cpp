// The word index: reader, reference blocks, and the replay of the fuzz corpus.
#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <map>
#include <random>
#include <sstream>
#include <thread>
#include <tuple>

#include "fuzz/wordindex_target.h"
#include "test_support.h"
#include "wordindex/index_writer.h"

namespace {

using testing_support::MessageCapture;
using Bytes = std::vector<uint8_t>;

Bytes BuildIndex(const std::string& listing, bool longForm = false) {
  WordIndexBuilder builder;
  std::istringstream in(listing);
  std::string error;
  Bytes bytes;
  const auto form = longForm ? WordIndexBuilder::Form::Long : WordIndexBuilder::Form::Compact;
  EXPECT_TRUE(builder.AddListing(in, error) && builder.Build(form, bytes, error)) << error;
  return bytes;
}

bool Open(const Bytes& b) { return OpenWordIndexFromMemory(b.data(), b.size(), "mem.Index") == 1; }

void Set(Bytes& b, std::size_t at, uint32_t value, int width) {
  for (int i = width - 1; i >= 0; --i, value >>= 8) b[at + i] = static_cast<uint8_t>(value);
}

Bytes ReadFile(const std::filesystem::path& path) {
  const std::string text = testing_support::ReadAll(path);
  return Bytes(text.begin(), text.end());
}

std::string Join(const std::vector<std::string>& items) {
  std::string joined;
  for (const std::string& item : items) joined += item + "|";
  return joined;
}

class WordIndexTest : public ::testing::Test {
 protected:
  void TearDown() override { CloseWordIndex(); }
  MessageCapture messages;
};

TEST_F(WordIndexTest, LookupAtGroupEdges) {
  // Lengths 1 and 6 hold one word each, 3 several; 2, 4 and 5 are empty.
  ASSERT_TRUE(
      Open(BuildIndex("q\ta\t1\nAbc\ta\t2\nabc\ta\t3\nabd\ta\t4\naaa\ta\t5\nzzz\ta\t6\n"
                      "ABC\ta\t7\n\\begin\ta\t8\n")));
  const std::pair<const char*, int> rows[] = {
      // word, its page or 0
      {"q", 1},      {"p", 0},       {"r", 0},   {"ABC", 7},     {"zzz", 6},
      {"abc", 3},    {"aBc", 0},     {"abd", 4}, {"AAA", 0},     {"zzzz", 0},
      {"\\begi", 0}, {"\\begin", 8}, {"", 0},    {"\\begins", 0}};
  for (const auto& [word, page] : rows) {
    std::vector<std::string> items;
    if (int32_t offset = FindIndexWord(word)) LoadWordReferences(offset, word, items);
    EXPECT_EQ(Join(items), page ? "a#page=" + std::to_string(page) + " |" : "") << word;
  }
  // A block starting at the end of the file, or whose header passes it.
  Bytes bytes = BuildIndex("abc\tx.pdf\t7\n");
  for (uint32_t block : {44u, 41u, 40u}) {
    Set(bytes, 23, block, 4);
    ASSERT_TRUE(Open(bytes));
    EXPECT_EQ(FindIndexWord("abc"), block == 40 ? 40 : 0) << block;
  }
}

TEST_F(WordIndexTest, LabelReadAmidABlockAndTheRange) {
  ASSERT_TRUE(Open(BuildIndex("w\tdoc/first.pdf\t1\nx\tsecond.pdf\t2\n")));
  unsigned char header[4];
  ASSERT_TRUE(ReadIndexBytes(FindIndexWord("w"), header, 4));
  char label[kLabelBufferSize];
  EXPECT_EQ(ReadIndexLabel(2, label), 10);
  EXPECT_STREQ(label, "second.pdf");
  // index, buffer size, label
  const std::tuple<int, std::size_t, const char*> rows[] = {
      {1, 256, "doc/first.pdf"}, {1, 4, "doc"}, {0, 256, ""}, {3, 256, ""}, {-1, 256, ""}};
  for (const auto& [index, size, expected] : rows) {
    std::vector<char> buffer(size, 'z');
    EXPECT_EQ(ReadIndexLabel(index, buffer.data(), size), int(strlen(expected))) << index;
    EXPECT_STREQ(buffer.data(), expected) << "label " << index;
  }
}

TEST_F(WordIndexTest, DamagedHeadersAreRefused) {
  // Lengths 2 and 3, two labels: group offsets at 4, 8, 12, LabelCount at 16,
  // label offsets at 18, 21, 24; records from 27.
  const Bytes valid = BuildIndex("ab\tone.pdf\t1\nabc\ttwo.pdf\t2\n");
  ASSERT_EQ(valid[7], 27);
  ASSERT_TRUE(Open(valid));
  ASSERT_TRUE(Open(BuildIndex("")));  // no words and no labels is still an index
  const uint32_t size = static_cast<uint32_t>(valid.size());
  // what, where, new value, its width, message
  const std::tuple<const char*, std::size_t, uint32_t, int, const char*> rows[] = {
      {"signature XW", 0, 0x5857, 2, "Invalid signature"},
      {"first group offset inside the header", 4, 20, 4, "header"},
      {"group offsets going backwards", 8, 26, 4, "out of order"},
      {"group offset one past the end", 8, size + 1, 4, "outside"},
      {"LabelCount 8191", 16, 8191, 2, "Too many labels"},
      {"LabelCount beyond what the file holds", 16, 4000, 2, "truncated"},
      {"label offset one past the end", 24, size + 1, 3, "outside"},
      {"label offsets going backwards", 21, 1, 3, "out of order"},
      {"max length two below min", 3, 0, 1, "word lengths"},
      {"max length 255 in a short file", 3, 255, 1, "truncated"},
  };
  for (const auto& [what, at, value, width, message] : rows) {
    Bytes bytes = valid;
    Set(bytes, at, value, width);
    messages.clear();
    EXPECT_FALSE(Open(bytes)) << what;
    EXPECT_EQ(WordIndexHandle, nullptr) << what;
    EXPECT_TRUE(messages.Contains("ERROR: ") && messages.Contains(message) &&
                messages.Contains("mem.Index"))
        << what;
  }
  for (std::size_t length = 0; length < valid.size(); ++length) {
    messages.clear();
    EXPECT_EQ(OpenWordIndexFromMemory(valid.data(), length, "cut"), 0) << length;
    EXPECT_TRUE(messages.Contains("ERROR: ")) << "cut at " << length;
  }
  EXPECT_EQ(OpenWordIndex("/nonexistent/command.Index"), 0);
  EXPECT_TRUE(messages.Contains("ERROR: Can't open Word Index file: /nonexistent/command.Index"));
}

TEST_F(WordIndexTest, ReferenceBlocks) {
  using namespace std::string_literals;
  const std::string labels = "x\tb\t1\nx\tc\t1\nx\ta\t1\n";  // labels b 1, c 2, a 3
  const Bytes compact = BuildIndex(labels + "w\ta\t12 15\nw\tb\t2\n");
  const Bytes longForm = BuildIndex(labels + "w\ta\t12 15\nw\tb\t2\n", true);
  const Bytes bare = BuildIndex(labels + "w\ta\t12 15\nw\tb\t\n");
  const std::string label(189, 'd');  // with "#page=1 22 ": 200 characters
  const Bytes cut = BuildIndex("w\t" + label + "\t1 22 333 4444\n");
  // Its last block's size claims 0xFFFFFF bytes: one entry and an odd byte follow.
  const Bytes pastEnd = ReadFile(DOCUVANE_FUZZ_CORPUS "/wordindex/entries-past-end.Index");
  // what, index, bytes written over the block from its word on, items, message
  const std::tuple<const char*, const Bytes&, std::string, std::string, const char*> rows[] = {
      {"compact", bare, "", "a#page=12 15 |b#page=|", ""},
      {"long", longForm, "", "a#page=12 15 |b#page=2 |", ""},
      {"pages stop once the text reaches 200", cut, "", label + "#page=1 22 |", ""},
      {"compact label 0: its pages go too", compact, "w\x80\0\0\x0C"s, "b#page=2 |", "no label"},
      {"long label 0 first", longForm, "w\0\0\0\x0C"s, "a#page=15 |b#page=2 |", ""},
      {"long label returning", longForm, "w\0\3\0\x0C\0\1\0\x0F\0\3"s,
       "a#page=12 |b#page=15 |a#page=2 |", ""},
      {"mismatched label", compact, "v", "", "ERROR: Mismatched References label: v"},
      {"size past the end of the file", pastEnd, "", "x#page=9 |", "WARNING: References cut"},
  };
  for (const auto& [what, index, patch, expected, message] : rows) {
    Bytes bytes = index;
    ASSERT_TRUE(Open(bytes)) << what;
    const int32_t offset = FindIndexWord("w");
    std::copy(patch.begin(), patch.end(), bytes.begin() + offset + 4);
    ASSERT_TRUE(Open(bytes)) << what;
    messages.clear();
    std::vector<std::string> items{"before"};
    const int count = LoadWordReferences(offset, "W", items);  // label matched ignoring case
    EXPECT_EQ(count + 1, int(items.size())) << what;
    EXPECT_EQ(Join(items), "before|" + expected) << what;
    EXPECT_TRUE(!*message || messages.Contains(message)) << what;
  }
  ASSERT_TRUE(Open(pastEnd));
  std::vector<std::string> items;
  for (int32_t at : {33, 35, 36})  // the block header or its label runs past the end
    EXPECT_EQ(LoadWordReferences(at, "w", items) + items.size(), 0u) << at;
}

TEST(WordIndexFuzzReplay, EveryCorpusFileRunsCleanly) {
  MessageCapture quiet;
  int files = 0, opened = 0;
  for (const auto& entry : std::filesystem::directory_iterator(DOCUVANE_FUZZ_CORPUS "/wordindex")) {
    const Bytes bytes = ReadFile(entry.path());
    SCOPED_TRACE(entry.path().filename().string());
    FuzzWordIndexInput(bytes.data(), bytes.size());
    opened += OpenWordIndexFromMemory(bytes.data(), bytes.size(), "replay");
    ++files;
  }
  CloseWordIndex();
  EXPECT_GE(files, 8);
  EXPECT_GE(opened, 8);  // the seed files made by docuvane-mkindex
}

}  // namespace

namespace {

// The list's order, its counters (from zero at every fill) and the
// bisecting search, against a scan of the sorted list.
TEST_F(WordIndexTest, WordListOrderCountersAndSearch) {
  ASSERT_TRUE(
      Open(BuildIndex("\\alpha\ta.pdf\t1\n{align}\ta.pdf\t1\nAlpha\ta.pdf\t1\n"
                      "\\@ifnextchar\ta.pdf\t1\n\\Section\ta.pdf\t1\n\\section\ta.pdf\t1\n"
                      "sectional\ta.pdf\t1\n{section}\ta.pdf\t1\nsec\ta.pdf\t1\n")));
  WordListData data;
  for (int fill = 0; fill < 2; ++fill) ASSERT_EQ(Fill_WordIndex(data), 1);
  EXPECT_EQ(CommandWordCount, 3) << "counted once, from zero at every fill";
  EXPECT_EQ(EnvironmentWordCount, 2);
  EXPECT_TRUE(messages.Contains("Skipped index word: \\@ifnextchar"));
  std::vector<std::string> order(data.Words.begin(), data.Words.end());
  // {align} first; \alpha and Alpha compare equal, as do \Section and \section.
  EXPECT_EQ(order[0], "{align}");
  EXPECT_EQ(order[3], "sec");
  EXPECT_EQ(order[6], "sectional");
  EXPECT_EQ(order[7], "{section}");
  const auto row = [&](const char* word) {
    return int(std::find(order.begin(), order.end(), word) - order.begin());
  };
  // text, exact, expected row
  const std::tuple<const char*, int, int> rows[] = {
      {"", 0, 0},
      {"SEC", 0, 3},
      {"\\sec", 0, std::min(row("\\Section"), row("\\section"))},
      {"{sec", 0, 7},
      {"section", 1, row("\\section")},
      {"sectio", 1, 4},
      {"sec", 1, 3},
      {"alpha}", 0, -1},
      {"\\", 0, std::min(row("\\alpha"), row("\\Section"))},
      {"zzz", 0, -1},
      {"{", 0, 0},
  };
  for (const auto& [text, exact, expected] : rows)
    EXPECT_EQ(FindWordInList(data.Words, text, exact), expected) << text << " " << exact;

  // Started ahead on a thread of its own and taken over: the same words in
  // the same order, the same counters, its messages written when taken.
  messages.clear();
  CommandWordCount = EnvironmentWordCount = 0;
  Start_Fill_WordIndex();
  std::this_thread::sleep_for(std::chrono::milliseconds(50));
  EXPECT_FALSE(messages.Contains("Skipped index word")) << "held back until taken";
  WordListData ahead;
  EXPECT_EQ(Take_Started_Fill(ahead), int(order.size()));
  EXPECT_TRUE(messages.Contains("Skipped index word: \\@ifnextchar"));
  EXPECT_EQ(CommandWordCount, 3);
  EXPECT_EQ(EnvironmentWordCount, 2);
  ahead.Wait();
  EXPECT_EQ(std::vector<std::string>(ahead.Words.begin(), ahead.Words.end()), order);
  EXPECT_EQ(Take_Started_Fill(ahead), -1) << "taken once";

  // Many words, with marks, cases, short ones and long shared leads: in the
  // list's order, and equal words in the order they came.
  std::mt19937 random(7);
  std::vector<std::string> texts;
  const char* const leads[] = {"", "\\", "{"};
  for (int i = 0; i < 20000; ++i) {
    std::string w = leads[random() % 3];
    if (random() % 4 == 0) w += "definitely";  // shares more than eight bytes
    for (int n = random() % 12; n >= 0; --n) w += "aAbB_:z\xe9"[random() % 8];
    texts.push_back(w);
  }
  std::vector<const char*> sorted;
  std::map<const char*, std::size_t> came;
  for (const std::string& t : texts) came[t.c_str()] = came.size(), sorted.push_back(t.c_str());
  SortIndexWords(sorted);
  for (std::size_t i = 1; i < sorted.size(); ++i) {
    const int compared = CompareIndexWords(sorted[i - 1], sorted[i]);
    ASSERT_LE(compared, 0) << sorted[i - 1] << " before " << sorted[i];
    if (compared == 0) {
      ASSERT_LT(came[sorted[i - 1]], came[sorted[i]]) << "equal words keep their order";
    }
  }
}

}  // namespace
