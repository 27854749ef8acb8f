// Finding the word index file.
#pragma once

#include <string>

extern std::string WordIndexPath;  // full path of command.Index, or empty

// Searches "${TEXDIR}/Update", then the documentation tree; once a path is
// found later calls return it without searching.
const std::string& LocateWordIndex();
