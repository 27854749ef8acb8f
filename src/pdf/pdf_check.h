// Whether a file holds a whole PDF document: what a transfer that stopped
// early cannot give.
#pragma once

#include <string>

// True when the file starts with a PDF header, ends with its end-of-file
// marker, its last "startxref" offset leads to a cross-reference section or
// stream inside the file, and the PDF library opens it with at least one
// page.  Otherwise false, with the first thing found wrong in `problem`.
bool IsCompletePdf(const std::string& path, std::string& problem);
