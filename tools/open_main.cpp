// docuvane-open: opens a PDF document at a place in a PDF viewer.
//
//   docuvane-open [ANCHOR] DOCUMENT
//
// ANCHOR is what follows the "#" of a location: "page=12 15 " (the first
// page counts), "nameddest=D" or a named destination D.  The viewer is the
// one named by $DOCUVANE_VIEWER, else by the Viewer key of the [Setup]
// section of Docuvane.ini, else the desktop's default for PDF, else the
// first installed of evince, okular, zathura, mupdf, qpdfview and atril.
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "launch/choice.h"
#include "launch/viewer.h"
#include "open_destination.h"
#include "platform/desktop_entry.h"
#include "platform/exec.h"
#include "platform/findexec.h"
#include "platform/profile.h"
#include "trovlib/trovlib.h"

namespace {

constexpr const char* kPdfType = "application/pdf";
constexpr unsigned long kViewerValueSize = 512;

void Warn(const std::string& text) { TrovMessage("WARNING: docuvane-open ", text.c_str(), 4); }

int Fail(const std::string& text, int status) {
  TrovMessage("ERROR: docuvane-open ", text.c_str(), 5);
  return status;
}

int Usage() {
  std::fputs("usage: docuvane-open [ANCHOR] DOCUMENT\n", stderr);
  return 2;
}

int Help() {
  std::printf(
      "usage: docuvane-open [ANCHOR] DOCUMENT\n"
      "Opens a PDF document in a PDF viewer, at the page or named destination\n"
      "that ANCHOR gives (\"page=N\", \"nameddest=NAME\" or NAME).\n"
      "The viewer: $DOCUVANE_VIEWER, else Viewer= in the [Setup] section of\n"
      "Docuvane.ini, else the desktop's default for PDF, else the first installed of\n"
      "evince, okular, zathura, mupdf, qpdfview, atril.\n");
  return 0;
}

ViewerSources Sources() {
  ViewerSources sources;
  if (const char* named = std::getenv("DOCUVANE_VIEWER")) sources.environmentChoice = named;
  if (const char* ini = TrovSearch("$TEXMF/Docuvane//", "Docuvane.ini")) {
    sources.iniPath = ini;
    char value[kViewerValueSize];
    GetPrivateProfileStringA("Setup", "Viewer", "", value, sizeof value, sources.iniPath.c_str());
    sources.iniChoice = value;
  }
  sources.desktopDefault = [](DesktopEntry& entry) {
    return ReadDesktopEntry(DefaultApplicationId(kPdfType), entry);
  };
  sources.findProgram = FindOnPath;
  sources.warn = Warn;
  return sources;
}

}  // namespace

int main(int argc, char** argv) {
  if (argc == 2 && (std::strcmp(argv[1], "--help") == 0 || std::strcmp(argv[1], "-h") == 0))
    return Help();
  if (argc < 2 || argc > 3) return Usage();
  std::string document = argv[argc - 1];
  // A name that begins with "-" would be read as an option by the viewer.
  if (!document.empty() && document[0] == '-') document = "./" + document;
  PdfAnchor anchor = ParseAnchor(argc == 3 ? argv[1] : "");

  ViewerChoice choice;
  if (!ChooseViewer(Sources(), choice))
    return Fail(
        "found no PDF viewer: install one (evince, okular, zathura, mupdf, qpdfview, "
        "atril) or name one in DOCUVANE_VIEWER",
        1);

  const ViewerRule* viewer = IdentifyViewer(choice.command.words);
  if (!anchor.destination.empty() && viewer != nullptr && !TakesNamedDestination(viewer)) {
    anchor.page = DestinationPage(document, anchor.destination);
    if (anchor.page == 0)
      Warn("the document has no destination " + anchor.destination + ": " + document);
    anchor.destination.clear();
  }

  const std::vector<std::string> args = ViewerArguments(choice.command, anchor, document);
  const std::string error = ReplaceProcess(args);
  return Fail("cannot start " + args[0] + " (" + choice.source + "): " + error, 127);
}
