// Settings read from the private INI file at start-up.
#pragma once

#include <string>

extern std::string IniFilePath;  // full path of Docuvane.ini, or "Docuvane.INI"
extern int TraceMode;            // [Setup] Trace; non-zero adds the extra traces
extern std::string RootPath;     // [Setup] Root after formatting; never unset

// Finds and reads the private INI file, then runs `openWordIndex`, the step
// that locates and opens the word index (it lives above the settings, so it
// is handed in).  Always returns 1.
int Docuvane_Init(void (*openWordIndex)());

// The Root value formatted with one string argument: "%s" takes the
// argument, "%%" gives "%", any other conversion is copied as it stands.
// The result is cut to 255 characters.
std::string FormatRootValue(const char* value, const char* argument);
