// The binary word index file: opening, header checks, word lookup, labels.
#include "wordindex/wordindex.h"

#include <cstring>
#include <string>
#include <vector>

#include "base/trace.h"
#include "platform/files.h"

RandomAccessFile* WordIndexHandle = nullptr;
int MinWordLength = 0;
int MaxWordLength = 0;
int32_t LengthOffsets[257];
int LabelCount = 0;
uint32_t LabelOffsets[8192];
int64_t WordIndexSize = 0;

namespace {

// The one open index file (or image in memory).
RandomAccessFile g_file;

// Offsets are signed 32-bit values, so no larger file can be addressed.
constexpr int64_t kMaxIndexSize = INT32_MAX;

uint32_t BigEndian(const unsigned char* p, int width) {
  uint32_t value = 0;
  for (int i = 0; i < width; ++i) value = (value << 8) | p[i];
  return value;
}

void Refuse(const char* why, const char* path) {
  std::string text = std::string("ERROR: ") + why;
  TraceMessage(text.c_str(), path);
}

void Forget() {
  g_file.Close();
  WordIndexHandle = nullptr;
  MinWordLength = MaxWordLength = 0;
  LabelCount = 0;
  WordIndexSize = 0;
}

// Reads and checks the header of the file in `f`, which becomes the word
// index on success and is closed otherwise.
int ReadHeader(RandomAccessFile& f, const char* path) {
  const int64_t size = f.Size();
  unsigned char head[4] = {0, 0, 0, 0};
  if (size < 2 || !f.ReadAt(0, head, 2) || head[0] != 'W' || head[1] != 'X') {
    f.Close();
    TraceMessage("ERROR: Invalid signature of Word Index file ", path);
    return 0;
  }
  auto fail = [&](const char* why) {
    f.Close();
    Refuse(why, path);
    return 0;
  };
  if (size > kMaxIndexSize) return fail("Word Index file is too large: ");
  if (!f.ReadAt(2, head + 2, 2)) return fail("Word Index file is truncated: ");

  const int minLength = head[2];
  const int maxLength = head[3];
  // One group offset per length from min to max + 1; max = min - 1 is an
  // index without words.
  const int groups = maxLength - minLength + 2;
  if (groups < 1) return fail("Invalid word lengths in Word Index file: ");

  std::vector<unsigned char> table(static_cast<std::size_t>(groups) * 4 + 2);
  if (!f.ReadAt(4, table.data(), table.size())) return fail("Word Index file is truncated: ");
  const int labels = static_cast<int>(BigEndian(&table[table.size() - 2], 2));
  if (labels > kMaxLabels) return fail("Too many labels in Word Index file: ");

  const int64_t labelTableAt = 4 + static_cast<int64_t>(table.size());
  std::vector<unsigned char> labelTable(static_cast<std::size_t>(labels + 1) * 3);
  if (!f.ReadAt(labelTableAt, labelTable.data(), labelTable.size()))
    return fail("Word Index file is truncated: ");
  const int64_t headerEnd = labelTableAt + static_cast<int64_t>(labelTable.size());

  int32_t lengthOffsets[257];
  uint32_t previous = static_cast<uint32_t>(headerEnd);
  for (int i = 0; i < groups; ++i) {
    uint32_t offset = BigEndian(&table[static_cast<std::size_t>(i) * 4], 4);
    if (offset > static_cast<uint64_t>(size))
      return fail("Word group offset outside Word Index file: ");
    if (offset < previous)
      return fail(i == 0 ? "Word group offset inside the header of Word Index file: "
                         : "Word group offsets out of order in Word Index file: ");
    lengthOffsets[minLength + i] = static_cast<int32_t>(offset);
    previous = offset;
  }

  uint32_t labelOffsets[kMaxLabels + 2];
  for (int k = 1; k <= labels + 1; ++k) {
    uint32_t offset = BigEndian(&labelTable[static_cast<std::size_t>(k - 1) * 3], 3);
    if (offset > static_cast<uint64_t>(size)) return fail("Label offset outside Word Index file: ");
    if (k > 1 && offset < labelOffsets[k - 1])
      return fail("Label offsets out of order in Word Index file: ");
    labelOffsets[k] = offset;
  }

  WordIndexHandle = &f;
  WordIndexSize = size;
  MinWordLength = minLength;
  MaxWordLength = maxLength;
  for (int L = minLength; L <= maxLength + 1; ++L) LengthOffsets[L] = lengthOffsets[L];
  LabelCount = labels;
  LabelOffsets[0] = 0;
  for (int k = 1; k <= labels + 1; ++k) LabelOffsets[k] = labelOffsets[k];
  return 1;
}

}  // namespace

int OpenWordIndex(const char* path) {
  Forget();
  if (path == nullptr) path = "";
  if (!g_file.Open(path)) {
    TraceMessage("ERROR: Can't open Word Index file: ", path);
    return 0;
  }
  return ReadHeader(g_file, path);
}

int OpenWordIndexFromMemory(const void* data, std::size_t size, const char* name) {
  Forget();
  if (name == nullptr) name = "";
  if (size == 0 || data == nullptr) {
    // fmemopen refuses an empty buffer; such a file has no signature anyway.
    TraceMessage("ERROR: Invalid signature of Word Index file ", name);
    return 0;
  }
  g_file.OpenMemory(std::vector<unsigned char>(static_cast<const unsigned char*>(data),
                                               static_cast<const unsigned char*>(data) + size));
  return ReadHeader(g_file, name);
}

void CloseWordIndex() { Forget(); }

bool ReadIndexBytes(int64_t offset, void* buffer, std::size_t count) {
  if (WordIndexHandle == nullptr) return false;
  return WordIndexHandle->ReadAt(offset, buffer, count);
}

int32_t FindIndexWord(const char* word) {
  if (WordIndexHandle == nullptr || word == nullptr) return 0;
  const std::size_t length = strlen(word);
  if (length < static_cast<std::size_t>(MinWordLength) ||
      length > static_cast<std::size_t>(MaxWordLength))
    return 0;
  const int L = static_cast<int>(length);
  const int32_t base = LengthOffsets[L];
  const int32_t R = L + 5;
  const int32_t n = (LengthOffsets[L + 1] - base) / R;
  if (n <= 0) return 0;

  unsigned char record[260];
  int32_t lo = -1;
  int32_t hi = n;
  for (;;) {
    const int32_t mid = (lo + hi) >> 1;
    const int64_t at = base + static_cast<int64_t>(mid) * R;
    if (!ReadIndexBytes(at, record, static_cast<std::size_t>(L) + 4)) return 0;
    const int order = memcmp(word, record, length);
    if (order == 0) {
      const uint32_t offset = BigEndian(record + L, 4);
      // A block needs at least its 4-byte header inside the file; 0 is
      // "not found" for every caller.
      if (offset == 0 || static_cast<int64_t>(offset) + 4 > WordIndexSize) return 0;
      return static_cast<int32_t>(offset);
    }
    if (order < 0)
      hi = mid;
    else
      lo = mid;
    if (hi - lo <= 1) return 0;
  }
}

int ReadIndexLabel(int index, char* buffer, std::size_t size) {
  if (buffer == nullptr || size == 0) return 0;
  buffer[0] = '\0';
  if (WordIndexHandle == nullptr || index < 1 || index > LabelCount) return 0;
  std::size_t length = LabelOffsets[index + 1] - LabelOffsets[index];
  if (length > size - 1) length = size - 1;
  // Reads name their own offset: a label read in the middle of a reference
  // block disturbs no other reader.
  const bool ok = ReadIndexBytes(LabelOffsets[index], buffer, length);
  if (!ok) {
    buffer[0] = '\0';
    return 0;
  }
  buffer[length] = '\0';
  return static_cast<int>(strlen(buffer));
}

std::vector<std::string> ListIndexLabels() {
  std::vector<std::string> labels;
  if (WordIndexHandle == nullptr || LabelCount < 1) return labels;
  // The header checks keep the offsets rising inside the file, so the
  // strings lie back to back and are read in one piece.
  const int64_t first = LabelOffsets[1];
  const int64_t size = static_cast<int64_t>(LabelOffsets[LabelCount + 1]) - first;
  std::string area(static_cast<std::size_t>(size), '\0');
  if (!ReadIndexBytes(first, &area[0], area.size())) return labels;
  labels.reserve(static_cast<std::size_t>(LabelCount));
  for (int k = 1; k <= LabelCount; ++k)
    labels.push_back(area.substr(LabelOffsets[k] - first, LabelOffsets[k + 1] - LabelOffsets[k]));
  return labels;
}
