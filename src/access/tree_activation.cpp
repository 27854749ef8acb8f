// Opening the document behind a tree item.
#include "access/tree_activation.h"

#include <string>

#include "access/opendoc.h"
#include "catalogue/documents.h"
#include "trovlib/trovlib.h"

namespace {

constexpr std::size_t kTraceCapacity = 512;

const char* OrNo(const std::string& field) { return field.empty() ? "NO" : field.c_str(); }

void TraceOpening(const std::string& text) {
  std::string line = text.substr(0, kTraceCapacity - 1);
  TrovMessage("INFOR: Openning ", line.c_str(), 2);
}

}  // namespace

int OpenTreeDocument(AccessServices& services, void* treeItem) {
  if (treeItem == nullptr) {
    TrovMessage("ERROR: Docuvane::Open_Document ", "invalid wxTreeItemId", 5);
    return 0;
  }
  const DocumentEntry* entry = nullptr;
  for (int i = 0; i < DocumentCount && i < kMaxDocuments; ++i) {
    if (DocumentTable[i].TreeItem == treeItem) {
      entry = &DocumentTable[i];
      break;
    }
  }
  if (entry == nullptr) {
    TrovMessage("ERROR: Docuvane::Open_Document --- ", "Not found clicked document", 5);
    return 0;
  }
  std::string state;
  state += entry->SearchMode != 0 ? 'U' : 'N';
  state += entry->SameAs != 0 ? 'P' : 'R';
  TraceOpening(state + " Label='" + OrNo(entry->Name) + "', File='" + OrNo(entry->FileName) + "'");
  TraceOpening(std::string("KeyFile='") + OrNo(entry->DefinitionFile) + "', Language='" +
               OrNo(entry->Language) + "', fileName='" + OrNo(entry->Path) + "'");
  return OpenDocumentFile(services, entry->Path.c_str(), nullptr);
}
