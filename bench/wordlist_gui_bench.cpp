// The window on large data:
//  - start-up to the shown window on a TeX tree of 50,000 files and 8,190
//    documents, with 200,000 and 800,000 index words, against the floor of a
//    minimal toolkit program that only shows an empty frame and exits
//    (bench/empty_frame.cpp; both timed as whole processes, with their peak
//    resident memory);
//    DOCUVANE_BENCH_TREE=<dir> keeps the tree there between runs, and
//    `--child=docuvane` with TEXMF and TEXDIR set runs one start by itself
//    (for a profiler);
//  - a keystroke in the search field to the filled Locations list (OnSearch:
//    FindWordInList and Show_Topic) on a word index of 200,000 words and
//    8,190 labels.
// Needs a display: run it under tests/run-with-display.sh.
#include <benchmark/benchmark.h>
#include <spawn.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>
#include <wx/app.h>
#include <wx/config.h>
#include <wx/frame.h>
#include <wx/image.h>
#include <wx/init.h>
#include <wx/listbox.h>
#include <wx/log.h>
#include <wx/srchctrl.h>

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "base/settings.h"
#include "catalogue/documents.h"
#include "catalogue/keywords.h"
#include "catalogue/pool.h"
#include "platform/font_setup_gui.h"
#include "platform/profile.h"
#include "shown_report.h"
#include "test_support.h"
#include "trovlib/prefetch.h"
#include "trovlib/trovlib.h"
#include "window/frame.h"
#include "window/panel.h"
#include "window/qlistbox.h"
#include "wordindex/index_writer.h"
#include "wordindex/locate.h"
#include "wordindex/wordindex.h"
#include "wordindex/wordlist.h"

namespace {

using Clock = std::chrono::steady_clock;

constexpr int kFiles = 50000;
constexpr int kPackages = 2500;
constexpr int kDocuments = 8190;
constexpr int kListed = 2000;  // [DOC] entries; the rest of the catalogue are labels
constexpr int kWords = 200000;

std::string FileName(int i) {
  char name[64];
  std::snprintf(name, sizeof name, "pkg%04d/doc%05d.pdf", i % kPackages, i);
  return name;
}

uint64_t Next(uint64_t& state) {
  state ^= state << 13;
  state ^= state >> 7;
  state ^= state << 17;
  return state;
}

// 200,000 commands, environments and plain words over `labels`.
std::vector<uint8_t> MakeIndex(const std::vector<std::string>& labels, int words = kWords) {
  uint64_t state = 0x9E3779B97F4A7C15ull;
  WordIndexBuilder builder;
  std::string error;
  while (builder.WordCount() < static_cast<std::size_t>(words)) {
    std::string word;
    const uint64_t kind = Next(state) % 10;
    if (kind < 6)
      word = "\\";
    else if (kind < 8)
      word = "{";
    const int length = 3 + static_cast<int>(Next(state) % 14);
    for (int i = 0; i < length; ++i) word += static_cast<char>('a' + Next(state) % 26);
    if (kind >= 6 && kind < 8) word += "}";
    const int locations = 1 + static_cast<int>(Next(state) % 3);
    for (int l = 0; l < locations; ++l) {
      std::vector<int> pages;
      for (int p = 0, n = 1 + static_cast<int>(Next(state) % 4); p < n; ++p)
        pages.push_back(1 + static_cast<int>(Next(state) % 400));
      if (!builder.Add(word, labels[Next(state) % labels.size()], pages, error)) std::abort();
    }
  }
  std::vector<uint8_t> bytes;
  if (!builder.Build(WordIndexBuilder::Form::Compact, bytes, error)) std::abort();
  return bytes;
}

void WriteBytes(const std::string& path, const std::vector<uint8_t>& bytes) {
  std::ofstream(path, std::ios::binary)
      .write(reinterpret_cast<const char*>(bytes.data()),
             static_cast<std::streamsize>(bytes.size()));
}

// The start-up tree: 50,000 files, 2,000 [DOC] documents (one in eight with
// a definition file), an index of 200,000 words over 6,190 labels in
// Update/, one of 800,000 words in Update800k/Update/ (TEXDIR picks it).
struct StartupTree {
  testing_support::TempDir scratch;
  std::string tex, home;
  StartupTree() {
    const char* kept = std::getenv("DOCUVANE_BENCH_TREE");
    const std::string root = kept && *kept ? kept : scratch.path();
    tex = root + "/tex";
    home = root + "/home";
    std::filesystem::create_directories(home);
    if (!(kept && *kept && std::filesystem::exists(root + "/complete"))) Build(root);
    // As every TeX tree has it: the file-name database, written last.
    if (!std::filesystem::exists(tex + "/ls-R")) WriteLsR();
  }

  void Build(const std::string& root) {
    for (int i = 0; i < kFiles; ++i) Write("doc/" + FileName(i), "%PDF");
    std::string ini = "[Setup]\nTrace=0\n[DOC]\n";
    for (int i = 0; i < kListed; ++i) {
      char key[96];
      std::snprintf(key, sizeof key, "C%02d>G%03d>%05d", i / 400, i / 20, i);
      ini += std::string(key) + "=" + FileName(i).substr(8) + "\n";
      if (i % 8 == 0) {
        std::string ddf = "[Keywords]\n";
        for (int k = 0; k < 20; ++k)
          ddf += "#5Cword" + std::to_string((i * 7 + k * 101) % 2000) + "=anchor" +
                 std::to_string(k) + "\n";
        std::string name = FileName(i);
        name.replace(name.size() - 4, 4, ".ddf");
        Write("doc/" + name, ddf);
      }
    }
    Write("Docuvane/Docuvane.ini", ini);
    std::vector<std::string> labels;
    for (int i = kListed; i < kDocuments; ++i) labels.push_back("latex/" + FileName(i));
    std::filesystem::create_directories(tex + "/Update");
    WriteBytes(tex + "/Update/command.Index", MakeIndex(labels));
    std::filesystem::create_directories(root + "/Update800k/Update");
    WriteBytes(root + "/Update800k/Update/command.Index", MakeIndex(labels, 4 * kWords));
    std::ofstream(root + "/complete") << "1\n";
  }

  // Every directory below the tree with its entries, as mktexlsr lists them.
  void WriteLsR() {
    namespace fs = std::filesystem;
    std::string text = "% ls-R -- filename database for kpathsea; do not change this line.\n";
    std::vector<fs::path> dirs = {fs::path(tex)};
    for (const auto& entry : fs::recursive_directory_iterator(tex))
      if (entry.is_directory()) dirs.push_back(entry.path());
    for (const fs::path& dir : dirs) {
      const std::string relative = fs::relative(dir, tex).string();
      text += "\n" + (relative == "." ? std::string("./") : "./" + relative) + ":\n";
      for (const auto& entry : fs::directory_iterator(dir))
        text += entry.path().filename().string() + "\n";
    }
    std::ofstream(tex + "/ls-R") << text;
  }
  std::string TexDir(int words) const {
    return words > kWords ? tex.substr(0, tex.size() - 4) + "/Update800k" : tex;
  }

 private:
  void Write(const std::string& rel, const std::string& content) {
    std::filesystem::path p = std::filesystem::path(tex) / rel;
    std::filesystem::create_directories(p.parent_path());
    std::ofstream(p, std::ios::binary) << content;
  }
};

// ---------------------------------------------------------------------------
// Child processes for the start-up comparison.

int RunChild(int argc, char** argv) {
  // As the program's main does before the toolkit starts.
  TrovPrefetchSearch(kDocumentationCategory);
  TrovPrefetchSearch("Icon");
  FontConfigurationPreload fonts;
  if (!wxEntryStart(argc, argv)) return 2;
  wxTheApp->CallOnInit();
  wxLog::EnableLogging(false);
  // What start-up does before showing the window.
  wxTheApp->SetAppName("Docuvane");
  wxTheApp->SetVendorName("Lomari");
  wxInitAllImageHandlers();
  wxConfigBase::Get();
  Docuvane_Init(OpenInstalledWordIndex);
  Start_Fill_WordIndex();
  Start_Collect_Documents();
  wxFrame* frame = new MyFrame("Lomari Docuvane");
  // What the process does after the report is not start-up.
  ShowAndReport(frame);
  delete frame;
  delete wxConfigBase::Set(nullptr);
  wxEntryCleanup();
  return 0;
}

std::string SelfPath() {
  char buffer[4096];
  const ssize_t n = readlink("/proc/self/exe", buffer, sizeof buffer - 1);
  if (n <= 0) return "";
  buffer[n] = '\0';
  return buffer;
}

// One start of a child process, up to its shown window: the time from its
// spawning (ms, -1 when it failed), its peak resident memory (MiB) and the
// processor time of its main thread and of all its threads (ms).
struct Start {
  double ms = -1, peakMiB = 0, mainCpuMs = 0, processCpuMs = 0;
};

Start RunProcess(const std::string& mode, const std::string& binary = std::string()) {
  const auto spawned = Clock::now();
  // Spawned, not forked: a forked child would start with this process's
  // resident pages and report them as its peak.
  const std::string self = binary.empty() ? SelfPath() : binary;
  char* const args[] = {const_cast<char*>(self.c_str()), const_cast<char*>(mode.c_str()), nullptr};
  pid_t pid = 0;
  Start start;
  if (posix_spawn(&pid, self.c_str(), nullptr, nullptr, args, environ) != 0) return start;
  int status = 0;
  waitpid(pid, &status, 0);
  std::ifstream in(std::getenv("DOCUVANE_BENCH_REPORT_FILE"));
  long long shownNs = 0;
  double kib = 0;
  std::string unit;  // "kB"
  in >> shownNs >> kib >> unit >> start.mainCpuMs >> start.processCpuMs;
  start.peakMiB = kib / 1024.0;
  std::remove(std::getenv("DOCUVANE_BENCH_REPORT_FILE"));
  if (WIFEXITED(status) && WEXITSTATUS(status) == 0 && shownNs > 0)
    start.ms = std::chrono::duration<double, std::milli>(
                   Clock::time_point(std::chrono::nanoseconds(shownNs)) - spawned)
                   .count();
  return start;
}

double Median(std::vector<double> v) {
  std::sort(v.begin(), v.end());
  return v.empty() ? 0 : v[v.size() / 2];
}

// The starts of one program, with the medians of each figure as counters
// named after it.
struct Starts {
  std::vector<Start> runs;
  bool Failed() const {
    return std::any_of(runs.begin(), runs.end(), [](const Start& s) { return s.ms < 0; });
  }
  double Median(double Start::*figure) const {
    std::vector<double> values;
    for (const Start& s : runs) values.push_back(s.*figure);
    return ::Median(values);
  }
  void Report(benchmark::State& state, const std::string& name) const {
    state.counters[name + "_ms"] = Median(&Start::ms);
    state.counters[name + "_peak_MiB"] = Median(&Start::peakMiB);
    state.counters[name + "_main_cpu_ms"] = Median(&Start::mainCpuMs);
    state.counters[name + "_process_cpu_ms"] = Median(&Start::processCpuMs);
  }
};

// Starts of the empty frame and of the program, interleaved so that both
// see the same machine load, with the environment already set.
void CompareStartups(benchmark::State& state, const std::string& reportFile) {
  setenv("TROVLIB_STDERR_LEVEL", "9", 1);
  setenv("DOCUVANE_BENCH_REPORT_FILE", reportFile.c_str(), 1);
  // DOCUVANE_BENCH_BASELINE names an earlier build of this benchmark, whose
  // start runs interleaved with ours: before and after in one run.
  const char* baselineEnv = std::getenv("DOCUVANE_BENCH_BASELINE");
  const std::string baseline = baselineEnv ? baselineEnv : "";
  Starts empty, docuvane, before;
  for (auto _ : state) {
    for (int round = 0; round < 9; ++round) {
      empty.runs.push_back(RunProcess("--child=empty", DOCUVANE_EMPTY_FRAME));
      docuvane.runs.push_back(RunProcess("--child=docuvane"));
      if (!baseline.empty()) before.runs.push_back(RunProcess("--child=docuvane", baseline));
    }
  }
  if (empty.Failed() || docuvane.Failed())
    state.SkipWithError("a child process failed (no display?)");
  empty.Report(state, "empty_frame");
  docuvane.Report(state, "docuvane");
  state.counters["ratio"] = docuvane.Median(&Start::ms) / empty.Median(&Start::ms);
  if (!before.runs.empty()) {
    before.Report(state, "baseline");
    state.counters["baseline_ratio"] = before.Median(&Start::ms) / empty.Median(&Start::ms);
  }
}

void BM_StartupToShownWindow(benchmark::State& state) {
  static StartupTree tree;
  const int words = static_cast<int>(state.range(0));
  setenv("TEXMF", tree.tex.c_str(), 1);
  setenv("TEXDIR", tree.TexDir(words).c_str(), 1);
  setenv("HOME", tree.home.c_str(), 1);
  setenv("XDG_CACHE_HOME", (tree.home + "/cache").c_str(), 1);
  CompareStartups(state, tree.home + "/report");
}
BENCHMARK(BM_StartupToShownWindow)
    ->Arg(kWords)
    ->Arg(4 * kWords)
    ->Iterations(1)
    ->Unit(benchmark::kMillisecond);

// The same on the installed TeX trees and the index that
// `docuvane-mkindex --scan` made of their documentation, with the default
// trees: DOCUVANE_BENCH_SCANNED names the XDG_CACHE_HOME the scan ran with.
void BM_StartupScannedInstallation(benchmark::State& state) {
  const char* scanned = std::getenv("DOCUVANE_BENCH_SCANNED");
  if (scanned == nullptr || !*scanned) {
    state.SkipWithError("set DOCUVANE_BENCH_SCANNED to the XDG_CACHE_HOME of a scan");
    return;
  }
  static testing_support::TempDir home;
  unsetenv("TEXMF");
  unsetenv("TEXDIR");
  setenv("HOME", home.path().c_str(), 1);
  setenv("XDG_CACHE_HOME", scanned, 1);
  CompareStartups(state, home / "report");
}
BENCHMARK(BM_StartupScannedInstallation)->Iterations(1)->Unit(benchmark::kMillisecond);

// The same on the sample tree that comes with the program, for a
// comparison with the scanned installation in one run.
void BM_StartupSampleTree(benchmark::State& state) {
  static testing_support::TempDir home;
  setenv("TEXMF", DOCUVANE_SAMPLE_TEXMF, 1);
  unsetenv("TEXDIR");
  setenv("HOME", home.path().c_str(), 1);
  setenv("XDG_CACHE_HOME", (home / "cache").c_str(), 1);
  CompareStartups(state, home / "report");
}
BENCHMARK(BM_StartupSampleTree)->Iterations(1)->Unit(benchmark::kMillisecond);

// ---------------------------------------------------------------------------
// Keystroke to filled Locations list, in this process.

struct KeystrokeWindow {
  testing_support::TempDir dir;
  MyFrame* frame = nullptr;
  int words;
  std::vector<std::string> typed;  // every prefix of a sample of words, in typing order

  explicit KeystrokeWindow(int wordCount) : words(wordCount) {
    std::vector<std::string> labels;
    for (int i = 0; i < kDocuments; ++i) labels.push_back("latex/" + FileName(i));
    const std::string index = dir / "command.Index";
    WriteBytes(index, MakeIndex(labels, words));
    IniFilePath = dir.Write("Docuvane.ini", "[Setup]\n");
    setenv("HOME", dir.path().c_str(), 1);
    setenv("TEXMF", dir.path().c_str(), 1);
    TrovResetCaches();
    ProfileCacheClear();
    if (!OpenWordIndex(index.c_str())) std::abort();
    frame = new MyFrame("Lomari Docuvane");
    frame->Show();
    while (!frame->IsShownOnScreen()) wxYield();
    QListBox* list = frame->m_helpPanel->m_wordList;
    // Words spread over the whole list, typed one letter at a time.
    for (int k = 0; k < 64; ++k) {
      const std::string word = list->GetWord(static_cast<int>((list->GetItemCount() - 1) * k / 63));
      for (std::size_t n = 1; n <= word.size(); ++n) typed.push_back(word.substr(0, n));
    }
  }
  ~KeystrokeWindow() {
    frame->Destroy();
    wxYield();
  }
};

void BM_KeystrokeToLocations(benchmark::State& state) {
  // One window at a time: the word index is the process's.
  static std::unique_ptr<KeystrokeWindow> current;
  const int words = static_cast<int>(state.range(0));
  if (!current || current->words != words) {
    current.reset();
    current.reset(new KeystrokeWindow(words));
  }
  KeystrokeWindow& window = *current;
  Docuvane* panel = window.frame->m_helpPanel;
  if (DocumentCount != kDocuments) state.SkipWithError("catalogue incomplete");
  std::vector<double> each;
  std::size_t i = 0;
  for (auto _ : state) {
    const wxString text = wxString::FromUTF8(window.typed[i++ % window.typed.size()]);
    const auto start = Clock::now();
    panel->m_search->SetValue(text);  // runs OnSearch as typing does
    each.push_back(std::chrono::duration<double, std::micro>(Clock::now() - start).count());
    state.PauseTiming();
    if (panel->m_targetList->GetCount() == 0) state.SkipWithError("no locations");
    if (i % 64 == 0) wxYield();  // let the list repaint now and then, as it would
    state.ResumeTiming();
  }
  std::sort(each.begin(), each.end());
  state.counters["median_us"] = each[each.size() / 2];
  state.counters["p90_us"] = each[each.size() * 9 / 10];
  state.counters["max_us"] = each.back();
  state.counters["words"] = static_cast<double>(panel->m_wordList->GetItemCount());
  state.counters["labels"] = LabelCount;
}
BENCHMARK(BM_KeystrokeToLocations)
    ->Arg(kWords)
    ->Arg(4 * kWords)
    ->Iterations(2000)
    ->Unit(benchmark::kMicrosecond);

class BenchApp : public wxApp {
 public:
  bool OnInit() override { return true; }
};

}  // namespace

wxIMPLEMENT_APP_NO_MAIN(BenchApp);

int main(int argc, char** argv) {
  if (argc == 2 && std::strcmp(argv[1], "--child=docuvane") == 0) return RunChild(argc, argv);
  benchmark::Initialize(&argc, argv);
  if (!wxEntryStart(argc, argv)) {
    std::fprintf(stderr,
                 "wordlist_gui_bench: no display; run it under tests/run-with-display.sh\n");
    return 1;
  }
  wxTheApp->CallOnInit();
  wxLog::EnableLogging(false);
  setenv("TROVLIB_STDERR_LEVEL", "9", 1);
  benchmark::RunSpecifiedBenchmarks();
  benchmark::Shutdown();
  return 0;
}
