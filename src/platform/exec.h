// Replacing the running process by another program, and starting one whose
// output is read.
#pragma once

#include <string>
#include <vector>

// Runs argv[0] (a full path) in place of this process with argv as its
// arguments and no shell.  Returns only on failure, with the reason.
std::string ReplaceProcess(const std::vector<std::string>& argv);

// Starts argv[0] (looked up on PATH, no shell) with its standard input from
// /dev/null and its standard output into a pipe; with `quietErrors` its
// standard error goes to /dev/null too.  Gives the child's process id and
// the pipe's reading end (close-on-exec); false when it could not start.
bool SpawnWithOutputPipe(const char* const* argv, bool quietErrors, int* pid, int* output);
