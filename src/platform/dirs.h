// Directory helpers built on files.h.
#pragma once

#include <string>

// Creates `path` and every missing directory above it; true when it is a
// directory afterwards.
bool MakeDirectories(const std::string& path);
