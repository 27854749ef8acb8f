// The floor the start-up benchmarks compare against: a minimal wxWidgets
// program that shows an empty frame and ends, linked against nothing but
// the toolkit.  With DOCUVANE_BENCH_REPORT_FILE set it writes there, once
// the frame has been painted, the monotonic clock in nanoseconds and its
// peak resident memory (as /proc/self/status says it).
#include <wx/app.h>
#include <wx/frame.h>
#include <wx/init.h>

#include "shown_report.h"

namespace {

class EmptyApp : public wxApp {
 public:
  bool OnInit() override { return true; }
};

}  // namespace

wxIMPLEMENT_APP_NO_MAIN(EmptyApp);

int main(int, char** argv) {
  int argc = 1;  // the benchmarks' mode argument is not the toolkit's
  if (!wxEntryStart(argc, argv)) return 2;
  wxFrame* frame = new wxFrame(nullptr, wxID_ANY, "Empty");
  ShowAndReport(frame);
  delete frame;
  wxEntryCleanup();
  return 0;
}
