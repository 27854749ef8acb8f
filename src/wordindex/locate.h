// Finding the word index file.
#pragma once

#include <string>

extern std::string WordIndexPath;  // full path of command.Index, or empty

// Searches "${TEXDIR}/Update", then the documentation tree; once a path is
// found later calls return it without searching.
const std::string& LocateWordIndex();

// Start-up's word index step: locates the file, traces the path found
// ("Docuvane_Init --- WXFileName=") and opens it when there is one.
void OpenInstalledWordIndex();
