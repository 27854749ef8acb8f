// Where the sample TeX tree that comes with the program lives.
#pragma once

#include <string>

// The installed tree, <prefix>/share/docuvane/texmf beside the running
// program's <prefix>/bin, when it is there; else the tree assembled in the
// build tree.
std::string SampleTreeDirectory();
