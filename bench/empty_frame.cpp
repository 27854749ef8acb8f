// The floor the start-up benchmarks compare against: a minimal wxWidgets
// program that shows an empty frame and ends, linked against nothing but
// the toolkit.  With DOCUVANE_BENCH_REPORT_FILE set it writes there, once
// the frame has been painted, the monotonic clock in nanoseconds and its
// peak resident memory (as /proc/self/status says it).
#include <wx/app.h>
#include <wx/frame.h>
#include <wx/init.h>

#include <chrono>
#include <cstdlib>
#include <fstream>
#include <string>
#include <thread>

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
  frame->Show();
  while (!frame->IsShownOnScreen()) {
    wxYield();
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
  }
  wxYield();  // the first paint
  if (const char* reportFile = std::getenv("DOCUVANE_BENCH_REPORT_FILE")) {
    const auto shown = std::chrono::duration_cast<std::chrono::nanoseconds>(
                           std::chrono::steady_clock::now().time_since_epoch())
                           .count();
    std::ifstream status("/proc/self/status");
    std::string line, peak = "0";
    while (std::getline(status, line))
      if (line.rfind("VmHWM:", 0) == 0) peak = line.substr(6);
    std::ofstream(reportFile) << shown << " " << peak << "\n";
  }
  delete frame;
  wxEntryCleanup();
  return 0;
}
