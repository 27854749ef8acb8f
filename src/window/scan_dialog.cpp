// The scan of the installed documentation, run from the window.
#include "window/scan_dialog.h"

#include <wx/msgdlg.h>
#include <wx/progdlg.h>
#include <wx/stdpaths.h>

#include <cstdlib>
#include <string>

#include "base/trace.h"
#include "platform/files.h"
#include "platform/findexec.h"
#include "platform/worker.h"
#include "trovlib/trees.h"
#include "trovlib/trovlib.h"
#include "window/frame.h"

namespace {

// The tool is installed beside the program, or found on PATH.
std::string ScannerProgram() {
  const std::string self = wxStandardPaths::Get().GetExecutablePath().ToStdString();
  const std::size_t slash = self.rfind('/');
  if (slash != std::string::npos) {
    const std::string beside = self.substr(0, slash + 1) + "docuvane-mkindex";
    if (IsRegularFile(beside, true)) return beside;
  }
  return FindOnPath("docuvane-mkindex");
}

wxString Remaining(int seconds) {
  if (seconds < 0) return "Reading the documents...";
  return wxString::Format("Reading the documents, about %d:%02d left...", seconds / 60,
                          seconds % 60);
}

}  // namespace

bool ShouldOfferDocumentationScan() {
  const char* texmf = std::getenv("TEXMF");
  if (texmf != nullptr && *texmf != '\0') return false;
  if (IsRegularFile(UserTexTree() + "/Update/command.Index")) return false;
  return !InstalledTexTrees().empty();
}

void OfferDocumentationScan(MyFrame* frame) {
  const int answer = wxMessageBox(
      "Docuvane has no word index of your TeX documentation yet.\n\n"
      "Build it now from the installed manuals? It takes a minute or two; "
      "you can go on using Docuvane afterwards as before.",
      "Docuvane", wxYES_NO | wxICON_QUESTION, frame);
  if (answer == wxYES) RunDocumentationScan(frame);
}

bool RunDocumentationScan(MyFrame* frame) {
  const std::string program = ScannerProgram();
  if (program.empty()) {
    wxMessageBox("docuvane-mkindex was not found beside Docuvane or on PATH.", "Docuvane",
                 wxOK | wxICON_ERROR, frame);
    return false;
  }
  TraceMessage("Run scan: ", program.c_str());
  const char* argv[] = {program.c_str(), "--scan", "--progress-lines", nullptr};
  ChildProgram scan;
  if (!scan.Start(argv)) {
    wxMessageBox("docuvane-mkindex could not be started.", "Docuvane", wxOK | wxICON_ERROR, frame);
    return false;
  }
  wxProgressDialog dialog("Building the word index", "Finding the documents...", 100, frame,
                          wxPD_APP_MODAL | wxPD_CAN_ABORT | wxPD_ELAPSED_TIME | wxPD_AUTO_HIDE);
  std::string error;
  bool cancelled = false;
  while (!scan.Ended()) {
    std::string line;
    if (scan.ReadLine(line, 100)) {
      unsigned long done = 0, total = 0;
      int left = -1;
      if (std::sscanf(line.c_str(), "progress %lu %lu %d", &done, &total, &left) == 3 &&
          total > 0) {
        const int percent = static_cast<int>(done * 99 / total);
        if (!dialog.Update(percent, Remaining(left))) cancelled = true;
      } else if (line.compare(0, 6, "error ") == 0) {
        error = line.substr(6);
      }
    } else if (!dialog.Pulse()) {
      cancelled = true;
    }
    if (cancelled) break;
  }
  if (cancelled) {
    // The scan replaces its files only when it is complete: stopping it
    // leaves the old ones.
    scan.Stop();
    TraceMessage("Docuvane: scan ", "cancelled");
    return false;
  }
  const int status = scan.Wait();
  dialog.Update(100);
  if (status != 0) {
    const std::string text = error.empty() ? "the scan failed" : error;
    TrovMessage("ERROR: Docuvane scan ", text.c_str(), 5);
    wxMessageBox(wxString::FromUTF8(("The word index could not be built: " + text).c_str()),
                 "Docuvane", wxOK | wxICON_ERROR, frame);
    return false;
  }
  frame->Reload_Catalogue();
  return true;
}
