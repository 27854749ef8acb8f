// The TeX trees' own file-name database: the "ls-R" file at the top of a
// tree lists every directory of it with its entries.  Reading it is much
// cheaper than walking a tree of tens of thousands of files, as long as it
// is current.
#pragma once

#include <functional>
#include <string>
#include <string_view>
#include <vector>

namespace trovlib {

// The files below `root` (a directory without a trailing separator) as the
// nearest ls-R at or above it lists them: full paths, in the order a walk
// would give (shallower first, then by byte order of the path's steps).
//
// False, and the tree must be walked, when there is no such ls-R, when its
// first line is not the database's, when it does not list `root` itself,
// or when it is not current: it is current when every directory it lists
// below `root` still exists and last changed before the ls-R was written,
// not in the same clock tick (a directory's status change time moves
// whenever an entry is added, removed or renamed in it, and cannot be set
// back, so a file added anywhere is caught at its directory or, for a new
// directory, at the listed directory above it).
bool ReadCurrentLsR(const std::string& root, std::vector<std::string>& files);

// The same, each path handed to `each` (only once the database is known to
// be current, so nothing is handed over when the answer is false).
bool ReadCurrentLsR(const std::string& root, const std::function<void(std::string_view)>& each);

}  // namespace trovlib
