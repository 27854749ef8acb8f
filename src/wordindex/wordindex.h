// The binary word index file ("command.Index", signature "WX").
//
// The file is opened once and stays open; only the header tables are held in
// memory.  Every offset taken from the file is checked against the file's real
// size before it is used, so a damaged file is refused at open or yields
// nothing, and no read ever leaves the file's bytes.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

class RandomAccessFile;

constexpr int kMaxLabels = 8190;       // LabelOffsets holds entries 1..8191
constexpr int kLabelBufferSize = 256;  // callers' label buffers

extern RandomAccessFile* WordIndexHandle;  // the open file, or NULL when no index is open
extern int MinWordLength;
extern int MaxWordLength;
extern int32_t LengthOffsets[257];
extern int LabelCount;
extern uint32_t LabelOffsets[8192];
extern int64_t WordIndexSize;  // size in bytes of the open file

// Opens the file and reads its tables; 1 on success, 0 (with an "ERROR: "
// trace naming the path) when it cannot be opened or its header does not
// fit the file.
int OpenWordIndex(const char* path);

// Same, on bytes held in memory (copied); `name` stands for the path in traces.
int OpenWordIndexFromMemory(const void* data, std::size_t size, const char* name);

// Closes the index so that another may be opened (tests, tools).
void CloseWordIndex();

// Offset of the word's reference block, or 0 when the word is not indexed.
int32_t FindIndexWord(const char* word);

// Copies label `index` into `buffer` (cut to size - 1 bytes, NUL-terminated)
// and returns its length; 0 with an empty buffer for an index that names no
// label.  Every read names its own offset, so a label may be read in the
// middle of any other read.
int ReadIndexLabel(int index, char* buffer, std::size_t size = kLabelBufferSize);

// Reads `count` bytes at `offset`; false (nothing read) unless all of them
// lie inside the file.
bool ReadIndexBytes(int64_t offset, void* buffer, std::size_t count);

// Every label of the open index, whole, in index order (label k at position
// k - 1).  Empty when no index is open or its labels cannot be read.
std::vector<std::string> ListIndexLabels();
