// Finding command.Index: first among the installation's update files, then
// in the documentation tree.
#include "wordindex/locate.h"

#include "base/trace.h"
#include "platform/paths.h"
#include "trovlib/trovlib.h"
#include "wordindex/wordindex.h"

std::string WordIndexPath;

namespace {
// The path was kept in a 256-byte buffer; longer paths are refused rather
// than cut, since a cut path would name another file.
constexpr std::size_t kMaxWordIndexPath = 255;
constexpr const char* kWordIndexName = "command.Index";
}  // namespace

const std::string& LocateWordIndex() {
  if (!WordIndexPath.empty()) return WordIndexPath;

  const char* found = TrovSearch("${TEXDIR}/Update", kWordIndexName);
  if (found == nullptr) found = TrovSearch(kDocumentationCategory, kWordIndexName);
  if (found == nullptr) {
    WordIndexPath.clear();
    TraceMessage("Document Word Index File: ", "NOT FOUND");
    return WordIndexPath;
  }

  std::string path = found;
  if (path.size() > kMaxWordIndexPath) {
    TraceMessage("ERROR: Word Index file path too long: ", path.c_str());
    WordIndexPath.clear();
    return WordIndexPath;
  }
  WordIndexPath = Fix_Slashes(path);
  TraceMessage("Document Word Index File: ",
               WordIndexPath.empty() ? "NOT FOUND" : WordIndexPath.c_str());
  return WordIndexPath;
}

void OpenInstalledWordIndex() {
  LocateWordIndex();
  TraceMessage("Docuvane_Init --- WXFileName=", WordIndexPath.c_str());
  if (!WordIndexPath.empty()) OpenWordIndex(WordIndexPath.c_str());
}
