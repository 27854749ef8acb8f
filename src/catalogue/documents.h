// The catalogue of documents: the INI file's [DOC] section and the word
// index labels.
#pragma once

#include <string>

constexpr int kMaxDocuments = 8192;

struct DocumentEntry {
  std::string Name;            // tree path, ">" between levels
  std::string FileName;        // as listed in [DOC], or the label
  std::string Path;            // what is opened
  std::string DefinitionFile;  // empty when there is none
  std::string Language;
  int SearchMode = 0;
  int SameAs = -1;
  void* TreeItem = nullptr;  // the document's leaf in the tree (wxTreeItemId's id)
};

extern DocumentEntry DocumentTable[kMaxDocuments];
extern int DocumentCount;

// Fills the document table: the [DOC] documents, then the word index's
// labels.  When Start_Collect_Documents ran before, its work is taken over
// (waited for) instead of being done again.
void Collect_Documents();

// Begins reading the [DOC] documents and their definition files on a
// thread of its own, so that it overlaps with building the window; their
// messages are held back until Collect_Documents, which writes them in
// their place.  Nothing else may touch the document table, the keyword
// list or the pool until then.
void Start_Collect_Documents();

// Waits for a started collection, writing its messages (nothing when none
// was started).
void Finish_Started_Collection();

// The document's own title from the [Titles] section of the private INI
// file (key: the document's Path), or "" when it has none.
std::string DocumentTitle(const DocumentEntry& entry);
int AddDocument(const char* name, const char* fileName, const char* path, const char* language);
