// The PDF viewers the launcher knows, the anchors it understands and the
// command lines it builds from them.
#pragma once

#include <string>
#include <vector>

// Where in the document a viewer should open.
struct PdfAnchor {
  int page = 0;             // physical page, counted from 1; 0 when none
  std::string destination;  // named destination; "" when none
};

// "page=12 15 " asks for page 12 (a location's first page counts),
// "nameddest=D" and any other text for the destination D, "" for nothing.
PdfAnchor ParseAnchor(const std::string& anchor);

// How one known viewer takes a page and a named destination.
struct ViewerRule;

// The programs tried, in this order, when neither the user nor the desktop
// names a viewer.
std::vector<std::string> KnownViewerPrograms();

// The rule of the viewer that `command` starts, judged by the file name of
// its program (after "env" and its assignments); null for a viewer the
// launcher does not know, which gets the document without a place.
const ViewerRule* IdentifyViewer(const std::vector<std::string>& command);

// False for viewers that open a page but not a named destination: those
// need the destination turned into its page first.
bool TakesNamedDestination(const ViewerRule* viewer);

// A viewer's command as the user or a desktop entry gives it.
struct ViewerCommand {
  std::vector<std::string> words;  // Exec split into words, words[0] the program's path
  std::string name;                // the entry's Name, Icon and file, for %c %i %k
  std::string icon;
  std::string entryPath;
};

// The arguments that open `file` at `anchor`.  The command's field codes are
// expanded: %f %u %F %U stand for the document (a local path is a valid
// URL there), %i %c %k for the entry's icon, name and file, %% for "%", and
// the deprecated codes go.  The anchor is put in the viewer's own syntax
// around the document's word; a command without a file code gets the
// document at its end.  A destination reaches only viewers that take one.
std::vector<std::string> ViewerArguments(const ViewerCommand& command, const PdfAnchor& anchor,
                                         const std::string& file);
