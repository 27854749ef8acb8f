// The word index file: the worked example, lookups at group edges, labels,
// header refusals and the decoding of reference blocks.
#include "wordindex/wordindex.h"

#include <gtest/gtest.h>

#include <cstring>
#include <functional>
#include <sstream>
#include <string>
#include <vector>

#include "test_support.h"
#include "wordindex/index_writer.h"
#include "wordindex/references.h"

using testing_support::MessageCapture;
using testing_support::TempDir;

namespace {

std::vector<uint8_t> BuildIndex(const std::string& listing,
                                WordIndexBuilder::Form form = WordIndexBuilder::Form::Compact) {
  WordIndexBuilder builder;
  std::istringstream in(listing);
  std::string error;
  EXPECT_TRUE(builder.AddListing(in, error)) << error;
  std::vector<uint8_t> bytes;
  EXPECT_TRUE(builder.Build(form, bytes, error)) << error;
  return bytes;
}

bool Open(const std::vector<uint8_t>& bytes) {
  return OpenWordIndexFromMemory(bytes.data(), bytes.size(), "mem.Index") == 1;
}

// The word stored in the block a lookup returned.
std::string BlockWord(int32_t offset) {
  unsigned char n = 0;
  if (!ReadIndexBytes(offset, &n, 1)) return "<unreadable>";
  std::string word(n, '\0');
  if (!ReadIndexBytes(offset + 4, word.data(), n)) return "<unreadable>";
  return word;
}

std::vector<std::string> References(const char* word) {
  std::vector<std::string> items;
  int32_t offset = FindIndexWord(word);
  if (offset != 0) LoadWordReferences(offset, word, items);
  return items;
}

uint32_t Get(const std::vector<uint8_t>& b, std::size_t at, int width) {
  uint32_t v = 0;
  for (int i = 0; i < width; ++i) v = (v << 8) | b[at + i];
  return v;
}

void Set(std::vector<uint8_t>& b, std::size_t at, uint32_t v, int width) {
  for (int i = width - 1; i >= 0; --i, v >>= 8) b[at + i] = static_cast<uint8_t>(v);
}

class WordIndexTest : public ::testing::Test {
 protected:
  void TearDown() override { CloseWordIndex(); }
  MessageCapture messages;
};

const uint8_t kWorkedExample[44] = {
    0x57, 0x58, 0x03, 0x03, 0x00, 0x00, 0x00, 0x14, 0x00, 0x00, 0x00, 0x1C, 0x00, 0x01, 0x00,
    0x00, 0x27, 0x00, 0x00, 0x2C, 0x61, 0x62, 0x63, 0x00, 0x00, 0x00, 0x1C, 0x00, 0x03, 0x00,
    0x00, 0x04, 0x61, 0x62, 0x63, 0x80, 0x01, 0x00, 0x07, 0x78, 0x2E, 0x70, 0x64, 0x66};

TEST_F(WordIndexTest, WorkedExampleIsWrittenAndReadByteForByte) {
  std::vector<uint8_t> bytes = BuildIndex("abc\tx.pdf\t7\n");
  ASSERT_EQ(bytes, std::vector<uint8_t>(kWorkedExample, kWorkedExample + 44));

  TempDir dir;
  std::string path = dir.Write("command.Index", std::string(bytes.begin(), bytes.end()));
  ASSERT_EQ(OpenWordIndex(path.c_str()), 1);
  EXPECT_EQ(WordIndexSize, 44);
  EXPECT_EQ(MinWordLength, 3);
  EXPECT_EQ(MaxWordLength, 3);
  EXPECT_EQ(LabelCount, 1);
  EXPECT_EQ(FindIndexWord("abc"), 28);
  EXPECT_EQ(References("abc"), std::vector<std::string>{"x.pdf#page=7 "});
}

TEST_F(WordIndexTest, MissingFileAndBadSignatureLeaveNoIndex) {
  TempDir dir;
  std::string missing = dir / "nothing.Index";
  EXPECT_EQ(OpenWordIndex(missing.c_str()), 0);
  EXPECT_TRUE(messages.Contains("ERROR: Can't open Word Index file: " + missing));
  for (const char* head : {"XW", "wx"}) {
    std::vector<uint8_t> bytes(kWorkedExample, kWorkedExample + 44);
    bytes[0] = head[0];
    bytes[1] = head[1];
    std::string path = dir.Write(head, std::string(bytes.begin(), bytes.end()));
    messages.clear();
    EXPECT_EQ(OpenWordIndex(path.c_str()), 0);
    EXPECT_TRUE(messages.Contains("ERROR: Invalid signature of Word Index file " + path));
    EXPECT_EQ(WordIndexHandle, nullptr);
  }
}

TEST_F(WordIndexTest, LookupFindsEveryWordAtGroupEdgesAndNothingElse) {
  // Lengths 1 (one record), 3 (several, case-distinct), 6 (one record); 2,
  // 4 and 5 are empty groups.
  ASSERT_TRUE(Open(BuildIndex(
      "q\ta.pdf\t1\n"
      "Abc\ta.pdf\t2\nabc\ta.pdf\t3\nabd\tb.pdf\t4\naaa\tb.pdf\t5\nzzz\ta.pdf\t6\nABC\ta.pdf\t7\n"
      "\\begin\tb.pdf\t8\n")));
  ASSERT_EQ(MinWordLength, 1);
  ASSERT_EQ(MaxWordLength, 6);
  struct Row {
    const char* word;
    bool found;
    const char* why;
  };
  const Row rows[] = {
      {"q", true, "only record of a one-record group"},
      {"p", false, "before the only record"},
      {"r", false, "after the only record"},
      {"ABC", true, "first record of its group"},
      {"zzz", true, "last record of its group"},
      {"Abc", true, "case-distinct neighbour"},
      {"abc", true, "case-distinct neighbour"},
      {"aBc", false, "other capitals are another key"},
      {"aaa", true, "middle record"},
      {"abd", true, "middle record"},
      {"AAA", false, "smaller than every record"},
      {"zzzz", false, "length of an empty group"},
      {"\\begin", true, "longest length, one record"},
      {"\\begi", false, "empty group just below the longest"},
      {"", false, "shorter than the shortest word"},
      {"\\begins", false, "longer than the longest word"},
  };
  for (const Row& row : rows) {
    int32_t offset = FindIndexWord(row.word);
    if (row.found) {
      EXPECT_NE(offset, 0) << row.why << ": " << row.word;
      EXPECT_EQ(BlockWord(offset), row.word) << row.why;
    } else {
      EXPECT_EQ(offset, 0) << row.why << ": " << row.word;
    }
  }
}

TEST_F(WordIndexTest, LabelReadKeepsTheStreamPosition) {
  ASSERT_TRUE(Open(BuildIndex("w\tdoc/first.pdf\t1\nx\tsecond.pdf\t2\n")));
  ASSERT_EQ(LabelCount, 2);
  const int32_t offset = FindIndexWord("w");
  unsigned char header[4];
  ASSERT_TRUE(ReadIndexBytes(offset, header, 4));
  char label[kLabelBufferSize];
  EXPECT_EQ(ReadIndexLabel(2, label), 10);
  EXPECT_STREQ(label, "second.pdf");
  // The next byte read from the stream is the block's word, not label bytes.
  EXPECT_EQ(fgetc(WordIndexHandle), 'w');

  struct Row {
    int index;
    std::size_t size;
    const char* expected;
  };
  const Row rows[] = {
      {1, 256, "doc/first.pdf"}, {1, 4, "doc"}, {0, 256, ""}, {3, 256, ""}, {-1, 256, ""}};
  for (const Row& row : rows) {
    std::vector<char> buffer(row.size, 'z');
    EXPECT_EQ(ReadIndexLabel(row.index, buffer.data(), row.size),
              static_cast<int>(strlen(row.expected)));
    EXPECT_STREQ(buffer.data(), row.expected) << "label " << row.index;
  }
}

TEST_F(WordIndexTest, ZeroLabelsAndNoWordsStillOpen) {
  // LabelCount 0 still has one label offset.
  std::vector<uint8_t> bytes = BuildIndex("");
  ASSERT_EQ(bytes.size(), 4u + 4 + 2 + 3);
  ASSERT_TRUE(Open(bytes));
  EXPECT_EQ(LabelCount, 0);
  EXPECT_EQ(FindIndexWord("a"), 0);
  EXPECT_EQ(FindIndexWord(""), 0);
}

TEST_F(WordIndexTest, DamagedHeadersAreRefusedWithAMessage) {
  // Two words of lengths 2 and 3, two labels: group offsets at 4, 8, 12,
  // LabelCount at 16, label offsets at 18, 21, 24; records from 27.
  const std::vector<uint8_t> valid = BuildIndex("ab\tone.pdf\t1\nabc\ttwo.pdf\t2\n");
  ASSERT_EQ(Get(valid, 2, 1), 2u);
  ASSERT_EQ(Get(valid, 3, 1), 3u);
  ASSERT_EQ(Get(valid, 4, 4), 27u);
  ASSERT_TRUE(Open(valid));
  CloseWordIndex();

  struct Row {
    const char* what;
    std::function<void(std::vector<uint8_t>&)> damage;
    const char* message;
  };
  const uint32_t size = static_cast<uint32_t>(valid.size());
  const Row rows[] = {
      {"first group offset inside the header", [](auto& b) { Set(b, 4, 20, 4); }, "header"},
      {"group offsets going backwards", [](auto& b) { Set(b, 8, 26, 4); }, "out of order"},
      {"group offset past the end", [&](auto& b) { Set(b, 8, size + 1, 4); }, "outside"},
      {"record area overrunning the file", [&](auto& b) { Set(b, 12, size + 7, 4); }, "outside"},
      {"huge group offset", [](auto& b) { Set(b, 12, 0xFFFFFFF0u, 4); }, "outside"},
      {"LabelCount 8191", [](auto& b) { Set(b, 16, 8191, 2); }, "Too many labels"},
      {"LabelCount 65535", [](auto& b) { Set(b, 16, 65535, 2); }, "Too many labels"},
      {"LabelCount larger than the file holds", [](auto& b) { Set(b, 16, 4000, 2); }, "truncated"},
      {"label beyond the end", [&](auto& b) { Set(b, 24, size + 1, 3); }, "outside"},
      {"label offsets going backwards", [](auto& b) { Set(b, 21, 1, 3); }, "out of order"},
      {"max length two below min", [](auto& b) { Set(b, 3, 0, 1); }, "word lengths"},
      {"max length 255 with a short file", [](auto& b) { Set(b, 3, 255, 1); }, "truncated"},
  };
  for (const Row& row : rows) {
    std::vector<uint8_t> bytes = valid;
    row.damage(bytes);
    messages.clear();
    EXPECT_FALSE(Open(bytes)) << row.what;
    EXPECT_EQ(WordIndexHandle, nullptr) << row.what;
    EXPECT_TRUE(messages.Contains("ERROR: ")) << row.what;
    EXPECT_TRUE(messages.Contains(row.message)) << row.what;
    EXPECT_TRUE(messages.Contains("mem.Index")) << row.what;
  }

  // Every cut of the file loses at least the end of the last label.
  for (std::size_t length = 0; length < valid.size(); ++length) {
    messages.clear();
    EXPECT_EQ(OpenWordIndexFromMemory(valid.data(), length, "mem.Index"), 0) << "cut at " << length;
    EXPECT_EQ(WordIndexHandle, nullptr);
    EXPECT_TRUE(messages.Contains("ERROR: ")) << "cut at " << length;
  }
}

TEST_F(WordIndexTest, RecordPointingOutsideTheFileIsNotFound) {
  std::vector<uint8_t> bytes(kWorkedExample, kWorkedExample + 44);
  Set(bytes, 23, 44, 4);  // reference block at the very end
  ASSERT_TRUE(Open(bytes));
  EXPECT_EQ(FindIndexWord("abc"), 0);
  Set(bytes, 23, 41, 4);  // header would run past the end
  ASSERT_TRUE(Open(bytes));
  EXPECT_EQ(FindIndexWord("abc"), 0);
  Set(bytes, 23, 40, 4);
  ASSERT_TRUE(Open(bytes));
  EXPECT_EQ(FindIndexWord("abc"), 40);
}

// Labels b.pdf (1), c.pdf (2), a.pdf (3), then the word w of each example.
const char kLabels[] = "x\tb.pdf\t1\nx\tc.pdf\t1\nx\ta.pdf\t1\n";

TEST_F(WordIndexTest, ReferenceBlocksInBothForms) {
  ASSERT_TRUE(Open(BuildIndex(std::string(kLabels) + "w\ta.pdf\t12 15\nw\tb.pdf\t\n")));
  int32_t offset = FindIndexWord("w");
  unsigned char entries[8];
  ASSERT_TRUE(ReadIndexBytes(offset + 5, entries, 8));
  EXPECT_EQ(std::vector<uint8_t>(entries, entries + 8),
            (std::vector<uint8_t>{0x80, 0x03, 0x00, 0x0C, 0x00, 0x0F, 0x80, 0x01}));
  std::vector<std::string> items;
  EXPECT_EQ(LoadWordReferences(offset, "w", items), 2);
  EXPECT_EQ(items, (std::vector<std::string>{"a.pdf#page=12 15 ", "b.pdf#page="}));

  ASSERT_TRUE(Open(BuildIndex(std::string(kLabels) + "w\ta.pdf\t12 15\nw\tb.pdf\t2\n",
                              WordIndexBuilder::Form::Long)));
  EXPECT_EQ(References("w"), (std::vector<std::string>{"a.pdf#page=12 15 ", "b.pdf#page=2 "}));
  // The block's label is checked ignoring case.
  offset = FindIndexWord("w");
  items.clear();
  EXPECT_EQ(LoadWordReferences(offset, "W", items), 2);
}

TEST_F(WordIndexTest, PageListStopsAtTwoHundredCharacters) {
  const std::string label = std::string(187, 'd') + ".pdf";  // 191 + "#page=" = 197
  ASSERT_TRUE(Open(BuildIndex("w\t" + label + "\t1 22 333 4444\n")));
  EXPECT_EQ(References("w"), std::vector<std::string>{label + "#page=1 22 "});
}

TEST_F(WordIndexTest, DamagedReferenceBlocks) {
  const std::string listing = std::string(kLabels) + "w\ta.pdf\t12 15\nw\tb.pdf\t2\n";
  struct Row {
    const char* what;
    WordIndexBuilder::Form form;
    std::vector<uint8_t> entries;  // written over the block's first entries
    std::vector<std::string> items;
    int count;
    const char* message;
  };
  const auto compact = WordIndexBuilder::Form::Compact;
  const auto longForm = WordIndexBuilder::Form::Long;
  const Row rows[] = {
      {"compact label 0 drops its pages",
       compact,
       {0x80, 0x00, 0x00, 0x0C},
       {"b.pdf#page=2 "},
       1,
       "no label"},
      {"compact label above LabelCount", compact, {0x80, 0x04}, {"b.pdf#page=2 "}, 1, "no label"},
      {"long label 0 first: pages dropped",
       longForm,
       {0x00, 0x00, 0x00, 0x0C},
       {"a.pdf#page=15 ", "b.pdf#page=2 "},
       2,
       nullptr},
      {"long label above LabelCount",
       longForm,
       {0x00, 0x03, 0x00, 0x0C, 0x7F, 0xFF, 0x00, 0x0F},
       {"a.pdf#page=12 ", "b.pdf#page=2 "},
       2,
       "no label"},
      {"long label returning starts a second item",
       longForm,
       {0x00, 0x03, 0x00, 0x0C, 0x00, 0x01, 0x00, 0x0F, 0x00, 0x03, 0x00, 0x02},
       {"a.pdf#page=12 ", "b.pdf#page=15 ", "a.pdf#page=2 "},
       3,
       nullptr},
  };
  for (const Row& row : rows) {
    std::vector<uint8_t> bytes = BuildIndex(listing, row.form);
    ASSERT_TRUE(Open(bytes));
    const int32_t offset = FindIndexWord("w");
    std::copy(row.entries.begin(), row.entries.end(), bytes.begin() + offset + 5);
    ASSERT_TRUE(Open(bytes));
    messages.clear();
    std::vector<std::string> items;
    EXPECT_EQ(LoadWordReferences(offset, "w", items), row.count) << row.what;
    EXPECT_EQ(items, row.items) << row.what;
    if (row.message) EXPECT_TRUE(messages.Contains(row.message)) << row.what;
  }
}

TEST_F(WordIndexTest, LabelMismatchLeavesTheListAlone) {
  std::vector<uint8_t> bytes = BuildIndex("w\ta.pdf\t1\n");
  ASSERT_TRUE(Open(bytes));
  const int32_t offset = FindIndexWord("w");
  bytes[offset + 4] = 'v';
  ASSERT_TRUE(Open(bytes));
  std::vector<std::string> items{"kept"};
  EXPECT_EQ(LoadWordReferences(offset, "w", items), 0);
  EXPECT_EQ(items, std::vector<std::string>{"kept"});
  EXPECT_TRUE(messages.Contains("ERROR: Mismatched References label: v"));
}

TEST_F(WordIndexTest, EntryListReachingPastTheEndIsCut) {
  // A hand-laid file whose only block is last: S claims 0xFFFFFF bytes but
  // only one label start and one page follow.
  std::vector<uint8_t> bytes = {'W', 'X', 1,    1,    0,    0,   0,    20,   0,    0,    0,   26, 0,
                                1,   0,   0,    26,   0,    0,   27,   'w',  0,    0,    0,   27, 0,
                                'x', 1,   0xFF, 0xFF, 0xFF, 'w', 0x80, 0x01, 0x00, 0x09, 0x00};
  ASSERT_TRUE(Open(bytes));
  ASSERT_EQ(FindIndexWord("w"), 27);
  std::vector<std::string> items;
  EXPECT_EQ(LoadWordReferences(27, "w", items), 1);
  EXPECT_EQ(items, std::vector<std::string>{"x#page=9 "});  // the odd last byte is no entry
  EXPECT_TRUE(messages.Contains("WARNING: References cut"));

  // A block whose header or label runs past the end gives nothing.
  for (int32_t at : {33, 35, 36}) {
    items.clear();
    EXPECT_EQ(LoadWordReferences(at, "w", items), 0) << at;
    EXPECT_TRUE(items.empty());
  }
}

}  // namespace
