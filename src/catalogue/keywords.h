// Document definition files (".ddf") and the keyword list built from them.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

struct KeywordTarget {
  KeywordTarget* Next;  // next (older) target
  char* Anchor;
  int DocumentIndex;  // into DocumentTable
};

struct KeywordNode {
  KeywordNode* Next;
  char* Keyword;
  KeywordTarget* Targets;  // newest first
};

// Longest decoded keyword kept; longer keys are skipped with a warning.
constexpr std::size_t kMaxKeywordBytes = 63;

// The list runs from the head node (empty keyword, never reported) to the
// end node (never compared), sorted ignoring case.
extern KeywordNode KeywordListHead;
extern KeywordNode KeywordListEnd;

// Decodes "#xx" escapes of a key into `out` (at most size - 1 bytes and a NUL)
// and returns the decoded length (which may include NUL bytes).
std::size_t DecodeKeyword(const char* key, char* out, std::size_t size);

// The definition file's name for a document file name: cut at the last "."
// of the file's own name (not of a directory) and ".ddf" appended.
// The file name is first cut to 127 bytes.
std::string DefinitionFileName(const char* fileName);

// The names of a key list that the profile API put into a buffer of `size`
// bytes (`length` is what the call returned).  A list that filled the
// buffer was cut: `cut` is set and its last, partial name is left out.
std::vector<const char*> SplitKeyList(const char* list, unsigned long length, unsigned long size,
                                      bool& cut);

int Load_Document_Index(int documentIndex, int loadKeys);
void LoadKeywords(const char* definitionPath, int documentIndex);
void AddKeywordTarget(const char* keyword, const char* anchor, int documentIndex);

// Empties the list (the pool memory stays; see Clear_Tables).
void KeywordListReset();

// The first node whose keyword equals `word` ignoring case, or NULL.
const KeywordNode* FindKeyword(const char* word);

// The keyword target items of `word` ("path#anchor", newest first), and the
// single target (path, anchor) when the word has exactly one.
struct KeywordTargets {
  std::vector<std::string> items;
  bool single = false;
  std::string singlePath;
  std::string singleAnchor;
};
KeywordTargets CollectKeywordTargets(const char* word);

// Keyword target texts ("path#anchor") longer than this are not listed.
constexpr std::size_t kMaxKeywordTargetText = 127;
