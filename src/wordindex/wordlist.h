// The words of the index as the word list shows them: loaded in one read,
// '@' words skipped, sorted ignoring case and one leading backslash or brace.
#pragma once

#include <future>
#include <memory>
#include <vector>

extern int CommandWordCount;      // listed words that begin with a backslash
extern int EnvironmentWordCount;  // listed words that begin with '{'

struct WordListData {
  std::unique_ptr<char[]> RecordBuffer;  // the word record area, words NUL-terminated
  std::vector<const char*> Words;        // sorted, pointing into RecordBuffer
  // A sort still running on a worker (Fill_WordIndex in the background):
  // Words may be read only after Wait().
  mutable std::future<void> Sorting;
  void Wait() const {
    if (Sorting.valid()) Sorting.get();
  }
};

// Fills `data` from the open word index, counting its commands and
// environments from zero; 0 (list empty) when none is open.  With
// `sortInBackground` the words are read, checked and counted at once but
// sorted on a worker thread: data.Wait() before reading data.Words.
int Fill_WordIndex(WordListData& data, bool sortInBackground = false);

// Begins Fill_WordIndex for the open word index on a thread of its own, so
// that reading and counting the words overlaps with the toolkit's start;
// its messages are held back until Take_Started_Fill writes them.  Nothing
// may read the word index file, or close it, until then.
void Start_Fill_WordIndex();

// When a fill was started: waits until its words are read and counted,
// writes its messages and gives `data` the words (in the list's order once
// data.Wait() returns); the number of words, or -1 when none was started.
int Take_Started_Fill(WordListData& data);

// Waits for a started fill that nobody took, and drops it.
void Drop_Started_Fill();

// Sorts words into the list's order (CompareIndexWords).
void SortIndexWords(std::vector<const char*>& words);

// The list's order: <0, 0, >0.
int CompareIndexWords(const char* a, const char* b);

// Row of the first word that starts with `text` (see the word list rules),
// or with `exact` the row of the word equal to it; -1 when none.  `words`
// must be in the list's order (CompareIndexWords), as Fill_WordIndex leaves
// it: the search bisects.
int FindWordInList(const std::vector<const char*>& words, const char* text, int exact);
