// The sample tree of an installed program, else of the build tree.
#include "trovlib/sample_tree.h"

#include "platform/files.h"
#include "platform/program_dir.h"

std::string SampleTreeDirectory() {
  const std::string bin = ProgramDirectory();
  const std::size_t slash = bin.rfind('/');
  if (slash != std::string::npos) {
    // The prefix is named, not climbed to with "..", so that the tree shows
    // in messages as the user knows it.
    const std::string installed = bin.substr(0, slash) + "/share/docuvane/texmf";
    if (IsRegularFile(installed + "/Docuvane/Docuvane.ini")) return installed;
  }
  return DOCUVANE_SAMPLE_TEXMF;
}
