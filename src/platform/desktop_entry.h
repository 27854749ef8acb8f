// Desktop entries of the XDG data directories and the desktop's default
// application for a MIME type.
#pragma once

#include <string>
#include <vector>

// What a program needs of a desktop entry to start its application.
struct DesktopEntry {
  std::string path;  // the .desktop file
  std::string exec;  // Exec of [Desktop Entry], string escapes already undone
  std::string name;
  std::string icon;
};

// Finds the desktop file of `id` ("org.gnome.Evince.desktop") in the data
// directories ($XDG_DATA_HOME, then $XDG_DATA_DIRS) and reads it.  False
// when there is no such file or it has no Exec.
bool ReadDesktopEntry(const std::string& id, DesktopEntry& entry);

// The desktop file id that `xdg-mime query default` gives for the type,
// or "" when the desktop names none.
std::string DefaultApplicationId(const std::string& mimeType);

// Splits an Exec value into its words: blanks separate, double quotes group,
// and inside quotes a backslash escapes the next character.
std::vector<std::string> SplitDesktopExec(const std::string& value);
