// The program that the desktop associates with a file's type.
#pragma once

#include <string>

// Asks the desktop's MIME database which application opens `path`
// (xdg-mime query filetype, then xdg-mime query default) and returns the
// full path of the program named by that application's Exec line, found on
// PATH.  "" when the file does not exist or any step fails.  No shell is
// involved, and every helper is bounded in time.
std::string FindExecutable(const std::string& path);

// Full path of `program` (a path, or a name searched on PATH) when it is an
// executable file, else "".
std::string FindOnPath(const std::string& program);

// Runs argv (searched on PATH) without a shell and returns its standard
// output; false when it cannot be started, fails, or outlives `timeoutMs`.
bool RunAndCapture(const char* const* argv, std::string& output, int timeoutMs);
