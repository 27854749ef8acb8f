#!/bin/sh
# Holds the code to its layers: base (src/platform, src/trovlib, src/text,
# src/base) uses nothing of ours; core (the other folders of src/, and
# tools/) may use base and never the GUI toolkit; gui (src/window,
# src/shell and every *_gui file) may use both.  Also fails when two folders
# of src/ include each other, and when a file outside src/platform includes
# a system header of the operating system (and in src/platform, when a file
# that does is not named for its system: *_posix.cpp, *_x11.cpp, ...).  Prints each offence; exits 1 on any.
set -u
cd "$(dirname "$0")/.."
awk '
function layer(path) {
  if (path ~ /_gui\.(cpp|h)$/ || path ~ /^src\/(window|shell)\//) return 3
  if (path ~ /^src\/(platform|trovlib|text|base)\//) return 1
  return 2
}
function folder(path,  parts) { split(path, parts, "/"); return parts[1] == "src" ? parts[2] : parts[1] }
FNR == 1 { file = FILENAME }
/^[ \t]*#[ \t]*include[ \t]*</ {
  if (layer(file) < 3 && $0 ~ /<wx\//) { print file ": includes the GUI toolkit: " $0; bad = 1 }
  if ($0 ~ /<(unistd|fcntl|dirent|dlfcn|pwd|poll|spawn|signal|windows|shellapi)\.h>|<(sys|X11|gtk|gdk)\//) {
    if (file !~ /^src\/platform\//) {
      print file ": an operating-system header outside src/platform: " $0; bad = 1
    } else if (file ~ /\.cpp$/ && file !~ /_(posix|x11|gtk|win32)(_gui)?\.cpp$/) {
      print file ": uses the operating system but is not named for it (*_posix.cpp, ...)"; bad = 1
    }
  }
}
/^[ \t]*#[ \t]*include[ \t]*"/ {
  header = $0; sub(/^[^"]*"/, "", header); sub(/".*$/, "", header)
  if (header !~ /\//) next
  target = "src/" header
  if (layer(target) > layer(file)) { print file ": a lower layer includes " header; bad = 1 }
  from = folder(file); to = folder(target)
  if (file ~ /^src\// && from != to) edge[from "|" to] = file " -> " header
}
END {
  for (e in edge) {
    split(e, ft, "|")
    back = ft[2] "|" ft[1]
    if ((back in edge) && ft[1] < ft[2]) {
      print "folders " ft[1] " and " ft[2] " include each other: " edge[e] ", " edge[back]; bad = 1
    }
  }
  exit bad
}' $(git ls-files 'src/*.cpp' 'src/*.h' 'tools/*.cpp' 'tools/*.h') && echo "check-layers: every include keeps to its layer"
