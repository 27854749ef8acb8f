// What a start-up benchmark's child tells its parent once its window has
// been painted: when it stood (the system's monotonic clock, the same in
// both processes), the peak resident memory so far (rusage would count
// the parent's pages shared before exec) and the processor time spent by
// the main thread and by the whole process, written to
// DOCUVANE_BENCH_REPORT_FILE when that is set.
#pragma once

#include <time.h>
#include <wx/frame.h>
#include <wx/window.h>

#include <chrono>
#include <cstdlib>
#include <fstream>
#include <string>
#include <thread>

// Shows `frame`, waits for it to stand and be painted, then reports.
inline void ShowAndReport(wxFrame* frame) {
  frame->Show();
  while (!frame->IsShownOnScreen()) {
    wxYield();
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
  }
  wxYield();  // the first paint
  const char* reportFile = std::getenv("DOCUVANE_BENCH_REPORT_FILE");
  if (reportFile == nullptr) return;
  const auto shown = std::chrono::duration_cast<std::chrono::nanoseconds>(
                         std::chrono::steady_clock::now().time_since_epoch())
                         .count();
  std::ifstream status("/proc/self/status");
  std::string line, peak = "0";
  while (std::getline(status, line))
    if (line.rfind("VmHWM:", 0) == 0) peak = line.substr(6);
  auto cpuMs = [](clockid_t clock) {
    timespec t{};
    clock_gettime(clock, &t);
    return static_cast<double>(t.tv_sec) * 1e3 + static_cast<double>(t.tv_nsec) / 1e6;
  };
  std::ofstream(reportFile) << shown << " " << peak << " " << cpuMs(CLOCK_THREAD_CPUTIME_ID) << " "
                            << cpuMs(CLOCK_PROCESS_CPUTIME_ID) << "\n";
}
