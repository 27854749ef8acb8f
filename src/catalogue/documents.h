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

void Collect_Documents();

// The document's own title from the [Titles] section of the private INI
// file (key: the document's Path), or "" when it has none.
std::string DocumentTitle(const DocumentEntry& entry);
int AddDocument(const char* name, const char* fileName, const char* path, const char* language);
