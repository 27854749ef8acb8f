// Named destinations of a PDF document, read with poppler.
#pragma once

#include <string>

// The physical page (from 1) that the destination `name` of the document
// leads to; 0 when the document cannot be read or has no such destination.
int DestinationPage(const std::string& file, const std::string& name);
