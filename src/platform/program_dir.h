// Where the running program lives.
#pragma once

#include <string>

// The directory of the running executable (no trailing separator), or ""
// when the system does not tell.
std::string ProgramDirectory();
