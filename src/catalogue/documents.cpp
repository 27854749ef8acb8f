// The document table: documents listed in [DOC] of the private INI file,
// then one entry for every label of the word index.
#include "catalogue/documents.h"

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <future>
#include <memory>
#include <new>
#include <string>
#include <unordered_map>
#include <vector>

#include "base/settings.h"
#include "base/trace.h"
#include "catalogue/keywords.h"
#include "platform/files.h"
#include "platform/profile.h"
#include "text/text.h"
#include "trovlib/trovlib.h"
#include "wordindex/wordindex.h"

DocumentEntry DocumentTable[kMaxDocuments];
int DocumentCount = 0;

namespace {

constexpr unsigned long kKeyListSize = 32000;
constexpr unsigned long kValueSize = 64;
constexpr unsigned long kSearchFlagSize = 32;
constexpr const char* kTableFullMessage = "ERROR: Too many documents when try to add: ";

std::string NameLanguageKey(const std::string& name, const std::string& language) {
  return Folded(name) + '\0' + Folded(language);
}

// Finds duplicates by name without going through the whole table for every
// new document; a catalogue of thousands would otherwise cost millions of
// comparisons.  Entries appended straight into the table (the labels) are
// taken in the next time it is asked.
class DocumentLookup {
 public:
  void Clear() {
    first_by_name_language_.clear();
    by_name_.clear();
    indexed_ = 0;
  }

  // Index of the first entry with this name and language, or -1.
  int Find(const std::string& name, const std::string& language) {
    Sync();
    auto it = first_by_name_language_.find(NameLanguageKey(name, language));
    if (it == first_by_name_language_.end()) return -1;
    const DocumentEntry& entry = DocumentTable[it->second];
    if (CompareIgnoringCase(entry.Name.c_str(), name.c_str()) != 0 ||
        CompareIgnoringCase(entry.Language.c_str(), language.c_str()) != 0) {
      // The table was changed behind our back: look again from scratch.
      Clear();
      return FindByScan(name, language);
    }
    return it->second;
  }

  // Index of the last entry before `before` with this name, or -1.
  int FindLastByName(const std::string& name, int before) {
    Sync();
    auto it = by_name_.find(Folded(name));
    if (it == by_name_.end()) return -1;
    // The entries of one name, in table order: the last one below `before`.
    const std::vector<int>& indexes = it->second;
    auto below = std::lower_bound(indexes.begin(), indexes.end(), before);
    if (below == indexes.begin()) return -1;
    const int found = *(below - 1);
    if (CompareIgnoringCase(DocumentTable[found].Name.c_str(), name.c_str()) != 0) {
      // The table was changed behind our back.
      for (int i = before - 1; i >= 0; --i)
        if (CompareIgnoringCase(DocumentTable[i].Name.c_str(), name.c_str()) == 0) return i;
      return -1;
    }
    return found;
  }

 private:
  void Sync() {
    if (indexed_ > DocumentCount) Clear();
    for (; indexed_ < DocumentCount; ++indexed_) {
      const DocumentEntry& entry = DocumentTable[indexed_];
      first_by_name_language_.emplace(NameLanguageKey(entry.Name, entry.Language), indexed_);
      by_name_[Folded(entry.Name)].push_back(indexed_);
    }
  }

  int FindByScan(const std::string& name, const std::string& language) {
    for (int i = 0; i < DocumentCount; ++i)
      if (CompareIgnoringCase(DocumentTable[i].Name.c_str(), name.c_str()) == 0 &&
          CompareIgnoringCase(DocumentTable[i].Language.c_str(), language.c_str()) == 0)
        return i;
    return -1;
  }

  std::unordered_map<std::string, int> first_by_name_language_;
  std::unordered_map<std::string, std::vector<int>> by_name_;
  int indexed_ = 0;
};

DocumentLookup g_lookup;

int SearchModeOf(const char* name) {
  char flag[kSearchFlagSize] = "Y";
  if (const char* systemIni = TrovINIFile(1)) {
    const std::string file(systemIni);
    GetPrivateProfileStringA("Docuvane.Search", name, "Y", flag, sizeof flag, file.c_str());
  }
  int mode = (flag[0] == 'Y' || flag[0] == 'y') ? 1 : 0;
  if (flag[0] == 'P' || flag[0] == 'p' || name[0] == '*') mode = 2;
  return mode;
}

void AppendLabels() {
  for (const std::string& text : ListIndexLabels()) {
    const char* label = text.c_str();
    if (text.size() >= kLabelBufferSize) {
      TraceMessage("WARNING: Word index label longer than 255 bytes skipped: ", label);
      continue;
    }
    if (DocumentCount >= kMaxDocuments) {
      // Said once: the labels after this one do not fit either.
      TraceMessage(kTableFullMessage, label);
      return;
    }
    DocumentEntry& entry = DocumentTable[DocumentCount++];
    entry = DocumentEntry{};
    entry.FileName = label;
    entry.Path = label;
    entry.Name = label;
    for (char& c : entry.Name)
      if (c == '/' || c == '\\') c = '>';
    entry.Language = "ENG";
  }
}

}  // namespace

namespace {

void ResetDocumentTable() {
  for (int i = 0; i < DocumentCount; ++i) DocumentTable[i] = DocumentEntry{};
  DocumentCount = 0;
  g_lookup.Clear();
}

// The documents of the INI file's [DOC] section, with their definition files.
void CollectListedDocuments() {
  // Thousands of lookups in the INI file and the definition files: each
  // file is checked against the disk once for all of them.
  ProfileBatch batch;
  std::unique_ptr<char[]> keys(new (std::nothrow) char[kKeyListSize]);
  if (!keys) {
    TraceMessage("ERROR: Not available memory to collect document list", "");
    return;
  }

  const unsigned long listLength =
      GetPrivateProfileStringA("DOC", nullptr, "", keys.get(), kKeyListSize, IniFilePath.c_str());
  // A list that fills the buffer was cut: the documents after it are lost.
  bool cut = false;
  const std::vector<const char*> names = SplitKeyList(keys.get(), listLength, kKeyListSize, cut);
  if (cut) TraceMessage("WARNING: [DOC] key list cut at 32000 bytes in ", IniFilePath.c_str());
  char value[kValueSize];
  for (const char* key : names) {
    if (TraceMode != 0) TraceMessage("Collect Document:", key);
    GetPrivateProfileStringA("DOC", key, "", value, sizeof value, IniFilePath.c_str());
    if (value[0] == '\0') continue;

    const char* found = TrovSearch(kDocumentationCategory, value);
    if (found == nullptr) {
      if (TraceMode != 0) TraceMessage(value);
      continue;
    }
    const std::string path(found);  // the library's string does not last
    if (!PathExists(path)) {
      TraceMessage("ERROR: There is not Accesible Document file: ", path.c_str());
      continue;
    }
    if (TraceMode != 0) TraceMessage("Attach document: ", path.c_str());
    AddDocument(key, value, path.c_str(), "ENG");
  }
}

// The collection started ahead, with the messages it held back.
std::future<std::vector<TrovHeldMessage>> g_collecting;

}  // namespace

void Start_Collect_Documents() {
  if (g_collecting.valid()) return;
  ResetDocumentTable();
  g_collecting = std::async(std::launch::async, [] {
    std::vector<TrovHeldMessage> held;
    TrovHoldMessages(&held);
    CollectListedDocuments();
    TrovHoldMessages(nullptr);
    return held;
  });
}

void Finish_Started_Collection() {
  if (g_collecting.valid()) TrovReplayMessages(g_collecting.get());
}

void Collect_Documents() {
  if (g_collecting.valid()) {
    Finish_Started_Collection();
  } else {
    ResetDocumentTable();
    CollectListedDocuments();
  }
  if (WordIndexHandle != nullptr && LabelCount >= 1) AppendLabels();
}

int AddDocument(const char* name, const char* fileName, const char* path, const char* language) {
  if (name == nullptr) name = "";
  if (fileName == nullptr) fileName = "";
  if (path == nullptr) path = "";
  if (language == nullptr) language = "";

  const int listed = g_lookup.Find(name, language);
  if (listed >= 0) return listed;

  if (DocumentCount >= kMaxDocuments) {
    TraceMessage(kTableFullMessage, name);
    return -1;
  }

  const int n = DocumentCount;
  const int sameAs = g_lookup.FindLastByName(name, n);
  DocumentEntry& entry = DocumentTable[n];
  entry = DocumentEntry{};
  entry.Name = name;
  entry.FileName = fileName;
  entry.Path = path;
  entry.Language = language;
  ++DocumentCount;

  // The same document in another language: the earlier entry stands for
  // it, and this one gets no definition file of its own.
  if (sameAs >= 0) {
    entry.SameAs = sameAs;
    return sameAs;
  }

  if (Load_Document_Index(n, 1) == 1) entry.SearchMode = SearchModeOf(name);
  return n;
}

std::string DocumentTitle(const DocumentEntry& entry) {
  char title[256];
  GetPrivateProfileStringA("Titles", entry.Path.c_str(), "", title, sizeof title,
                           IniFilePath.c_str());
  return title;
}
