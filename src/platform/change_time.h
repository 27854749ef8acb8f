// When a file's inode last changed (its status change time): unlike the
// modification time it cannot be set back by a program, so it tells
// whether a directory's entries may have changed since a given moment.
#pragma once

#include <cstdint>
#include <string>

// False when the path cannot be examined; follows symbolic links.
bool ChangeTimeOf(const std::string& path, std::int64_t& changeNs);
