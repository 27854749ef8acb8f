// Replacing the running process by another program.
#pragma once

#include <string>
#include <vector>

// Runs argv[0] (a full path) in place of this process with argv as its
// arguments and no shell.  Returns only on failure, with the reason.
std::string ReplaceProcess(const std::vector<std::string>& argv);
