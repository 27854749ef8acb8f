// Path helpers shared by every part of the program.
#pragma once

#include <string>

// The platform separator.  Every step that turns '/' into a backslash on the
// original platform turns every backslash into this one instead.
constexpr char kPathSeparator = '/';

// Rewrites every backslash and '/' to the platform separator, in place, and
// returns the same text.  NULL gives NULL.
char* Fix_Slashes(char* path);
std::string& Fix_Slashes(std::string& path);

// The per-user runtime directory ($XDG_RUNTIME_DIR/lomari or
// /tmp/lomari-<uid>), created with mode 0700.  Empty, with the reason in
// `error`, when it cannot be made or is not a private directory of this user.
std::string RuntimeDirectory(std::string* error = nullptr);
