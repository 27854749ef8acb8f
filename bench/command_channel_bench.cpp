// A later start handing its command to the running instance: the time from
// the start to the instance's trace of the processed command, and the later
// process's own run time, as medians of 50 starts; also when the later
// start's first trace appears (what loading the program costs before any of
// its own code runs).  Against it, interleaved, the start-up of a minimal
// toolkit program to its shown empty frame (bench/empty_frame.cpp).  Needs
// a display (run it under tests/run-with-display.sh) and the program built
// beside it.
#include <benchmark/benchmark.h>
#include <limits.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <string>
#include <vector>

namespace {

const char* ProgramPath() {
  static const std::string path = [] {
    char self[PATH_MAX] = {0};
    const ssize_t n = readlink("/proc/self/exe", self, sizeof self - 1);
    std::string dir = n > 0 ? std::string(self, static_cast<std::size_t>(n)) : std::string("./x");
    return dir.substr(0, dir.rfind('/')) + "/docuvane";
  }();
  return path.c_str();
}

}  // namespace

#define DOCUVANE_PROGRAM ProgramPath()
#define DOCUVANE_SAMPLE_TREE DOCUVANE_SAMPLE_TEXMF
#include "e2e/e2e_support.h"

namespace {

using namespace e2e;

double Median(std::vector<double> values) {
  std::sort(values.begin(), values.end());
  const std::size_t n = values.size();
  return n == 0 ? 0 : n % 2 ? values[n / 2] : (values[n / 2 - 1] + values[n / 2]) / 2;
}

// Bytes appended to `path` since `offset`.
std::string ReadFrom(const std::string& path, std::size_t* offset) {
  std::ifstream in(path, std::ios::binary);
  in.seekg(static_cast<std::streamoff>(*offset));
  std::string more((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
  *offset += more.size();
  return more;
}

// Spawn to the painted empty frame in ms, -1 when it failed.
double EmptyFrameStartup(const std::string& reportFile) {
  setenv("DOCUVANE_BENCH_REPORT_FILE", reportFile.c_str(), 1);
  const auto start = Clock::now();
  char* const args[] = {const_cast<char*>(DOCUVANE_EMPTY_FRAME), nullptr};
  pid_t pid = 0;
  if (posix_spawn(&pid, DOCUVANE_EMPTY_FRAME, nullptr, nullptr, args, environ) != 0) return -1;
  int status = 0;
  waitpid(pid, &status, 0);
  unsetenv("DOCUVANE_BENCH_REPORT_FILE");
  long long shownNs = 0;
  std::ifstream(reportFile) >> shownNs;
  std::remove(reportFile.c_str());
  if (!WIFEXITED(status) || WEXITSTATUS(status) != 0 || shownNs == 0) return -1;
  return std::chrono::duration<double, std::milli>(
             Clock::time_point(std::chrono::nanoseconds(shownNs)) - start)
      .count();
}

void BM_ForwardedCommand(benchmark::State& state) {
  if (std::getenv("DISPLAY") == nullptr) {
    state.SkipWithError("no display: run under tests/run-with-display.sh");
    return;
  }
  Sandbox box;
  Process first = box.StartInstance();
  if (!first.Running()) {
    state.SkipWithError("the first instance did not start");
    return;
  }
  std::vector<double> endToEnd, ownRun, toolkitReady, emptyFrame;
  std::size_t offset = 0;
  ReadFrom(first.log, &offset);
  for (auto _ : state) {
    for (int i = 0; i < 50; ++i) {
      const double empty = EmptyFrameStartup(box.root() + "/empty-frame-report");
      if (empty < 0) {
        state.SkipWithError("the empty frame program failed");
        return;
      }
      emptyFrame.push_back(empty);
      const std::string word = "bench" + std::to_string(i);
      const std::string trace = "Docuvane: Search Keyword: " + word + "\n";
      std::string seen;
      const auto start = Clock::now();
      Process later = box.Start({word});
      double arrived = -1, ended = -1, started = -1;
      while ((arrived < 0 || ended < 0) && Clock::now() - start < std::chrono::seconds(20)) {
        const double now = std::chrono::duration<double, std::milli>(Clock::now() - start).count();
        // The later start's first trace: our own code runs.
        if (started < 0 && std::filesystem::exists(later.log) &&
            std::filesystem::file_size(later.log) > 0)
          started = now;
        if (arrived < 0) {
          seen += ReadFrom(first.log, &offset);
          if (seen.find(trace) != std::string::npos) arrived = now;
        }
        if (ended < 0 && !later.Running()) ended = now;
        std::this_thread::sleep_for(std::chrono::microseconds(200));
      }
      if (arrived < 0 || ended < 0) {
        state.SkipWithError("a forwarded command was not processed in time");
        return;
      }
      endToEnd.push_back(arrived);
      if (started >= 0) toolkitReady.push_back(started);
      ownRun.push_back(ended);
    }
  }
  state.counters["end_to_end_median_ms"] = Median(endToEnd);
  state.counters["later_start_median_ms"] = Median(ownRun);
  state.counters["later_first_trace_median_ms"] = Median(toolkitReady);
  state.counters["empty_frame_median_ms"] = Median(emptyFrame);
  state.counters["later_start_per_empty_frame"] = Median(ownRun) / Median(emptyFrame);
  first.Stop();
}

BENCHMARK(BM_ForwardedCommand)->Iterations(1)->Unit(benchmark::kMillisecond);

}  // namespace

BENCHMARK_MAIN();
