// Document definition files and the sorted keyword list built from them.
#include "catalogue/keywords.h"

#include <cstring>
#include <iterator>
#include <map>
#include <memory>
#include <new>
#include <string>
#include <vector>

#include "base/settings.h"
#include "base/trace.h"
#include "catalogue/documents.h"
#include "catalogue/pool.h"
#include "platform/profile.h"
#include "text/text.h"
#include "trovlib/trovlib.h"

namespace {

constexpr const char* kKeywordsSection = "Keywords";
constexpr unsigned long kKeyListSize = 32000;
constexpr unsigned long kValueSize = 128;
constexpr std::size_t kFileNameBufferSize = 128;

char g_emptyKeyword[1] = {'\0'};

// Every node of the list by its folded keyword, the head under "": the
// place of a new keyword is found without walking the list, whatever order
// the keywords come in.  Nodes are never removed, so it stays valid until
// the list is reset.
std::map<std::string, KeywordNode*>& NodesByKeyword() {
  static std::map<std::string, KeywordNode*> nodes;
  return nodes;
}

int HexValue(unsigned char c) {
  if (c >= '0' && c <= '9') return c - '0';
  if (c >= 'a' && c <= 'f') return c - 'a' + 10;
  if (c >= 'A' && c <= 'F') return c - 'A' + 10;
  return 0;
}

// A NUL-terminated copy of `text` in pool memory, or NULL.
char* PoolCopy(const char* text) {
  const std::size_t length = std::strlen(text);
  if (length >= static_cast<std::size_t>(kPoolChunkSize)) {
    // Cannot come from the keyword buffers; let the pool report it.
    PoolAlloc(1, kPoolChunkSize + 1);
    return nullptr;
  }
  char* copy = static_cast<char*>(PoolAlloc(1, static_cast<int>(length) + 1));
  if (copy != nullptr) std::memcpy(copy, text, length + 1);
  return copy;
}

}  // namespace

KeywordNode KeywordListEnd = {nullptr, g_emptyKeyword, nullptr};
KeywordNode KeywordListHead = {&KeywordListEnd, g_emptyKeyword, nullptr};

std::size_t DecodeKeyword(const char* key, char* out, std::size_t size) {
  if (size == 0) return 0;
  std::size_t n = 0;
  const unsigned char* p = reinterpret_cast<const unsigned char*>(key);
  while (*p != '\0' && n + 1 < size) {
    if (*p != '#') {
      out[n++] = static_cast<char>(*p++);
    } else if (p[1] == '\0') {
      ++p;  // a lone "#" at the end is dropped
    } else if (p[2] == '\0') {
      out[n++] = static_cast<char>(HexValue(p[1]));
      p += 2;
    } else {
      out[n++] = static_cast<char>(16 * HexValue(p[1]) + HexValue(p[2]));
      p += 3;
    }
  }
  out[n] = '\0';
  return n;
}

std::string DefinitionFileName(const char* fileName) {
  std::string name(fileName, strnlen(fileName, kFileNameBufferSize - 1));
  // Only a dot of the file's own name starts an extension; one in a
  // directory name ("tex.v2/README") must not cut the path.
  const std::size_t slash = name.find_last_of("/\\");
  const std::size_t dot = name.rfind('.');
  if (dot != std::string::npos && (slash == std::string::npos || dot > slash)) name.erase(dot);
  name += ".ddf";
  return name;
}

int Load_Document_Index(int documentIndex, int loadKeys) {
  if (documentIndex < 0 || documentIndex >= kMaxDocuments) return 0;
  DocumentEntry& entry = DocumentTable[documentIndex];

  const std::string shown(entry.FileName, 0, kFileNameBufferSize - 1);
  if (TraceMode != 0) TraceMessage("INFO: Load_Document_Index - ", shown.c_str());

  const std::string ddfName = DefinitionFileName(entry.FileName.c_str());
  const char* found = TrovSearch(kDocumentationCategory, ddfName.c_str());
  if (found == nullptr) return 0;
  const std::string path(found);  // the library's string does not last

  char keys[32];
  if (GetPrivateProfileStringA(kKeywordsSection, nullptr, "", keys, sizeof keys, path.c_str()) ==
          0 ||
      keys[0] == '\0')
    return 0;

  entry.DefinitionFile = path;
  if (loadKeys) LoadKeywords(path.c_str(), documentIndex);
  return 1;
}

void LoadKeywords(const char* definitionPath, int documentIndex) {
  std::unique_ptr<char[]> keys(new (std::nothrow) char[kKeyListSize]);
  if (!keys) {
    TraceMessage("ERROR: Can't Allocate buffer for Key List from file: ", definitionPath);
    return;
  }
  if (TraceMode != 0) TraceMessage("Loads Keys from file: ", definitionPath);

  const unsigned long listLength = GetPrivateProfileStringA(
      kKeywordsSection, nullptr, "", keys.get(), kKeyListSize, definitionPath);
  bool cut = false;
  const std::vector<const char*> names = SplitKeyList(keys.get(), listLength, kKeyListSize, cut);
  if (cut) TraceMessage("WARNING: [Keywords] key list cut at 32000 bytes in ", definitionPath);
  std::vector<char> keyword;
  char value[kValueSize];
  for (const char* key : names) {
    // Decoding never lengthens a key, so a buffer of its size takes it all
    // and shows whether the keyword is too long to keep.
    keyword.resize(std::strlen(key) + 1);
    if (DecodeKeyword(key, keyword.data(), keyword.size()) > kMaxKeywordBytes) {
      TraceMessage("WARNING: Keyword longer than 63 bytes skipped: ", key);
      continue;
    }

    GetPrivateProfileStringA(kKeywordsSection, key, key, value, sizeof value, definitionPath);
    if (value[0] == '\0') {
      AddKeywordTarget(keyword.data(), key, documentIndex);
      continue;
    }
    // Every piece between "#" is one anchor, empty ones included.
    char* piece = value;
    for (;;) {
      char* hash = std::strchr(piece, '#');
      if (hash != nullptr) *hash = '\0';
      AddKeywordTarget(keyword.data(), piece, documentIndex);
      if (hash == nullptr) break;
      piece = hash + 1;
    }
  }
}

std::vector<const char*> SplitKeyList(const char* list, unsigned long length, unsigned long size,
                                      bool& cut) {
  std::vector<const char*> names;
  cut = size >= 2 && length >= size - 2;
  if (size == 0) return names;
  const char* const end = list + (length < size ? length : size - 1);
  for (const char* name = list; name < end && *name != '\0';) {
    const std::size_t n = strnlen(name, static_cast<std::size_t>(end - name));
    if (cut && name + n >= end) break;  // cut short by the buffer
    names.push_back(name);
    name += n + 1;
  }
  return names;
}

void AddKeywordTarget(const char* keyword, const char* anchor, int documentIndex) {
  auto& nodes = NodesByKeyword();
  if (nodes.empty()) nodes.emplace(std::string(), &KeywordListHead);
  std::string folded = Folded(keyword);
  // The node of this keyword, or the last one before it.
  auto at = nodes.lower_bound(folded);
  KeywordNode* node = at != nodes.end() && at->first == folded ? at->second : nullptr;
  if (node == nullptr) {
    KeywordNode* previous = std::prev(at)->second;
    void* memory = PoolAlloc(1, static_cast<int>(sizeof(KeywordNode)));
    if (memory == nullptr) return;  // the pool has said why
    char* copy = PoolCopy(keyword);
    if (copy == nullptr) return;
    node = new (memory) KeywordNode{previous->Next, copy, nullptr};
    previous->Next = node;
    nodes.emplace_hint(at, std::move(folded), node);
  }

  void* memory = PoolAlloc(1, static_cast<int>(sizeof(KeywordTarget)));
  if (memory == nullptr) return;
  char* copy = PoolCopy(anchor);
  if (copy == nullptr) return;
  node->Targets = new (memory) KeywordTarget{node->Targets, copy, documentIndex};
}

void KeywordListReset() {
  KeywordListHead.Next = &KeywordListEnd;
  KeywordListHead.Targets = nullptr;
  NodesByKeyword().clear();
}
