// Pieces shared by the files of the path-search library; not for callers.
#pragma once

#include <mutex>
#include <string>
#include <vector>

namespace trovlib {

// One lock for every cached index and result string: the program calls the
// library from its GUI thread only, but tests and tools may not.
std::mutex& LibraryMutex();

// Value of a variable (environment first, then the built-in defaults), or
// false when it has none.  An empty environment value counts as unset, so
// that `TEXMF=` does not turn every search into a search of "/".
bool LookupVariable(const std::string& name, std::string& value);

// Expands $VAR and ${VAR} in `pattern`.  A variable whose value holds
// several ':'-separated entries multiplies the pattern, one result per entry
// (in order, empty entries skipped).  Backslashes become '/'.  Returns false
// when the pattern names a variable without a value, unless `unset_as_empty`
// asks to expand it to nothing.
bool ExpandPattern(const std::string& pattern, std::vector<std::string>& out,
                   bool unset_as_empty = false);

// Drops the cached file-name indexes (search.cpp).
void ResetSearchCaches();

// Splits `text` at ':' and drops empty pieces.
std::vector<std::string> SplitList(const std::string& text);

}  // namespace trovlib
