// The one conversion between the program's 8-bit strings (the locale's
// encoding) and the toolkit's strings.
#pragma once

#include <wx/string.h>

#include <string>

// For display: the locale's conversion; bytes the locale cannot read are
// shown one character per byte (Latin-1) rather than lost.
wxString ToWx(const std::string& text);
inline wxString ToWx(const char* text) { return ToWx(std::string(text ? text : "")); }

// Back to 8 bits: the locale's conversion; text the locale cannot express
// goes out as Latin-1 when it fits that, else as UTF-8, rather than as nothing.
std::string FromWx(const wxString& text);
