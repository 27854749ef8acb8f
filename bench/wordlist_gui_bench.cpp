// The window on large data:
//  - start-up to the shown window on a TeX tree of 50,000 files and 8,190
//    documents, against the floor of a process of the same binary that only
//    shows an empty frame and exits (both timed as whole processes);
//  - a keystroke in the search field to the filled Locations list (OnSearch:
//    FindWordInList and Show_Topic) on a word index of 200,000 words and
//    8,190 labels.
// Needs a display: run it under tests/run-with-display.sh.
#include <benchmark/benchmark.h>
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
#include <string>
#include <thread>
#include <vector>

#include "catalogue/documents.h"
#include "catalogue/keywords.h"
#include "catalogue/pool.h"
#include "platform/profile.h"
#include "base/settings.h"
#include "wordindex/locate.h"
#include "test_support.h"
#include "trovlib/trovlib.h"
#include "window/frame.h"
#include "window/panel.h"
#include "wordindex/index_writer.h"
#include "window/qlistbox.h"
#include "wordindex/wordindex.h"

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
std::vector<uint8_t> MakeIndex(const std::vector<std::string>& labels) {
  uint64_t state = 0x9E3779B97F4A7C15ull;
  WordIndexBuilder builder;
  std::string error;
  while (builder.WordCount() < static_cast<std::size_t>(kWords)) {
    std::string word;
    const uint64_t kind = Next(state) % 10;
    if (kind < 6) word = "\\";
    else if (kind < 8) word = "{";
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
      .write(reinterpret_cast<const char*>(bytes.data()), static_cast<std::streamsize>(bytes.size()));
}

// The start-up tree: 50,000 files, 2,000 [DOC] documents (one in eight with
// a definition file), an index of 200,000 words over 6,190 labels.
struct StartupTree {
  testing_support::TempDir tex, home;
  StartupTree() {
    for (int i = 0; i < kFiles; ++i) tex.Write("doc/" + FileName(i), "%PDF");
    std::string ini = "[Setup]\nTrace=0\n[DOC]\n";
    for (int i = 0; i < kListed; ++i) {
      char key[96];
      std::snprintf(key, sizeof key, "C%02d>G%03d>%05d", i / 400, i / 20, i);
      ini += std::string(key) + "=" + FileName(i).substr(8) + "\n";
      if (i % 8 == 0) {
        std::string ddf = "[Keywords]\n";
        for (int k = 0; k < 20; ++k)
          ddf += "#5Cword" + std::to_string((i * 7 + k * 101) % 2000) + "=anchor" + std::to_string(k) + "\n";
        std::string name = FileName(i);
        name.replace(name.size() - 4, 4, ".ddf");
        tex.Write("doc/" + name, ddf);
      }
    }
    tex.Write("Docuvane/Docuvane.ini", ini);
    std::vector<std::string> labels;
    for (int i = kListed; i < kDocuments; ++i) labels.push_back("latex/" + FileName(i));
    std::filesystem::create_directories(tex / "Update");
    WriteBytes(tex / "Update/command.Index", MakeIndex(labels));
  }
};

// ---------------------------------------------------------------------------
// Child processes for the start-up comparison.

int RunChild(int argc, char** argv, bool docuvane) {
  if (!wxEntryStart(argc, argv)) return 2;
  wxTheApp->CallOnInit();
  wxLog::EnableLogging(false);
  wxFrame* frame;
  if (docuvane) {
    // What start-up does before showing the window.
    wxTheApp->SetAppName("Docuvane");
    wxTheApp->SetVendorName("Lomari");
    wxInitAllImageHandlers();
    wxConfigBase::Get();
    Docuvane_Init(OpenInstalledWordIndex);
    frame = new MyFrame("Lomari Docuvane");
  } else {
    frame = new wxFrame(nullptr, wxID_ANY, "Empty");
  }
  frame->Show();
  while (!frame->IsShownOnScreen()) {
    wxYield();
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
  }
  wxYield();  // the first paint
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

double RunProcess(const std::string& mode) {
  const auto start = Clock::now();
  const pid_t pid = fork();
  if (pid == 0) {
    const std::string self = SelfPath();
    execl(self.c_str(), self.c_str(), mode.c_str(), static_cast<char*>(nullptr));
    _exit(127);
  }
  int status = 0;
  waitpid(pid, &status, 0);
  const double ms = std::chrono::duration<double, std::milli>(Clock::now() - start).count();
  return WIFEXITED(status) && WEXITSTATUS(status) == 0 ? ms : -1;
}

double Median(std::vector<double> v) {
  std::sort(v.begin(), v.end());
  return v.empty() ? 0 : v[v.size() / 2];
}

void BM_StartupToShownWindow(benchmark::State& state) {
  static StartupTree tree;
  setenv("TEXMF", tree.tex.path().c_str(), 1);
  setenv("HOME", tree.home.path().c_str(), 1);
  setenv("XDG_CACHE_HOME", (tree.home / "cache").c_str(), 1);
  setenv("TROVLIB_STDERR_LEVEL", "9", 1);
  unsetenv("TEXDIR");
  std::vector<double> empty, docuvane;
  for (auto _ : state) {
    for (int round = 0; round < 7; ++round) {
      // Interleaved, so both see the same machine load.
      empty.push_back(RunProcess("--child=empty"));
      docuvane.push_back(RunProcess("--child=docuvane"));
    }
  }
  if (std::count(empty.begin(), empty.end(), -1.0) || std::count(docuvane.begin(), docuvane.end(), -1.0))
    state.SkipWithError("a child process failed (no display?)");
  state.counters["empty_frame_ms"] = Median(empty);
  state.counters["docuvane_ms"] = Median(docuvane);
  state.counters["ratio"] = Median(docuvane) / Median(empty);
}
BENCHMARK(BM_StartupToShownWindow)->Iterations(1)->Unit(benchmark::kMillisecond);

// ---------------------------------------------------------------------------
// Keystroke to filled Locations list, in this process.

struct KeystrokeWindow {
  testing_support::TempDir dir;
  MyFrame* frame = nullptr;
  std::vector<std::string> typed;  // every prefix of a sample of words, in typing order

  KeystrokeWindow() {
    std::vector<std::string> labels;
    for (int i = 0; i < kDocuments; ++i) labels.push_back("latex/" + FileName(i));
    const std::string index = dir / "command.Index";
    WriteBytes(index, MakeIndex(labels));
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
};

void BM_KeystrokeToLocations(benchmark::State& state) {
  static KeystrokeWindow window;
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
BENCHMARK(BM_KeystrokeToLocations)->Iterations(2000)->Unit(benchmark::kMicrosecond);

class BenchApp : public wxApp {
 public:
  bool OnInit() override { return true; }
};

}  // namespace

wxIMPLEMENT_APP_NO_MAIN(BenchApp);

int main(int argc, char** argv) {
  if (argc == 2 && std::strcmp(argv[1], "--child=empty") == 0) return RunChild(argc, argv, false);
  if (argc == 2 && std::strcmp(argv[1], "--child=docuvane") == 0) return RunChild(argc, argv, true);
  benchmark::Initialize(&argc, argv);
  if (!wxEntryStart(argc, argv)) {
    std::fprintf(stderr, "wordlist_gui_bench: no display; run it under tests/run-with-display.sh\n");
    return 1;
  }
  wxTheApp->CallOnInit();
  wxLog::EnableLogging(false);
  setenv("TROVLIB_STDERR_LEVEL", "9", 1);
  benchmark::RunSpecifiedBenchmarks();
  benchmark::Shutdown();
  return 0;
}
