// Which viewer opens a PDF document: the user's, the desktop's, or the first
// known one that is installed.
#pragma once

#include <functional>
#include <string>

#include "launch/viewer.h"
#include "platform/desktop_entry.h"

// Everything the choice looks at.  The launcher fills it from its
// environment; each source may be empty.
struct ViewerSources {
  std::string environmentChoice;  // $DOCUVANE_VIEWER
  std::string iniChoice;          // [Setup] Viewer of the private INI file
  std::string iniPath;            // named in messages
  // The desktop's default application for PDF documents; false for none.
  std::function<bool(DesktopEntry& entry)> desktopDefault;
  // Full path of an installed program, "" when there is none.
  std::function<std::string(const std::string& program)> findProgram;
  std::function<void(const std::string& message)> warn;
};

struct ViewerChoice {
  ViewerCommand command;  // words[0] is the program's full path
  std::string source;     // where the choice came from, for messages
};

// Tries, in this order: the environment variable, the INI key, the desktop
// default, the known viewers.  A user's choice is a command line read like
// a desktop entry's Exec, so "zathura --fork" or "viewer --page-from %f"
// both work.  A named viewer that is not installed, or that is this
// launcher itself, is reported and passed over.  False when none is left.
bool ChooseViewer(const ViewerSources& sources, ViewerChoice& choice);
