// The process-wide tables, owned in one place.
#include "catalogue/tables.h"

#include "base/settings.h"
#include "catalogue/documents.h"
#include "catalogue/keywords.h"
#include "catalogue/pool.h"
#include "catalogue/tree.h"
#include "trovlib/trovlib.h"
#include "wordindex/locate.h"
#include "wordindex/wordindex.h"
#include "wordindex/wordlist.h"

void Clear_Tables() {
  Finish_Started_Collection();
  Drop_Started_Fill();
  for (int i = 0; i < DocumentCount; ++i) DocumentTable[i] = DocumentEntry{};
  DocumentCount = 0;
  KeywordListReset();
  PoolReset();
  CloseWordIndex();
  WordIndexPath.clear();
  CommandWordCount = 0;
  EnvironmentWordCount = 0;
  HighlightedItem = nullptr;
  IniFilePath.clear();
  TraceMode = 0;
  RootPath.clear();
  TrovResetCaches();
}
