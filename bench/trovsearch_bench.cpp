// TrovSearch in a documentation tree of 50,000 files: the first call builds
// the tree's file-name index, every later call must be a lookup in it.
#include <benchmark/benchmark.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <memory>
#include <string>

#include "test_support.h"
#include "trovlib/trovlib.h"

namespace {

constexpr int kPackages = 500;
constexpr int kFilesPerPackage = 100;  // 500 x 100 = 50,000 files, plus a README per package

// doc/pkgNNN/subK/fNNNNN.pdf, and doc/pkgNNN/README in every package: one
// name shared by 500 paths, for names with directories.
class Tree {
 public:
  Tree() {
    namespace fs = std::filesystem;
    int n = 0;
    for (int p = 0; p < kPackages; ++p) {
      std::string pkg = dir_ / ("doc/pkg" + std::to_string(p));
      for (int s = 0; s < 4; ++s) fs::create_directories(pkg + "/sub" + std::to_string(s));
      std::ofstream(pkg + "/README") << "r";
      for (int f = 0; f < kFilesPerPackage; ++f, ++n)
        std::ofstream(pkg + "/sub" + std::to_string(f % 4) + "/f" + std::to_string(n) + ".pdf");
    }
    setenv("TEXMF", dir_.path().c_str(), 1);
    TrovResetCaches();
  }
  const std::string& path() const { return dir_.path(); }

 private:
  testing_support::TempDir dir_;
};

Tree& SharedTree() {
  static Tree tree;
  return tree;
}

void BM_FirstCallBuildsIndex(benchmark::State& state) {
  SharedTree();
  for (auto _ : state) {
    TrovResetCaches();
    benchmark::DoNotOptimize(TrovSearch("TeX system documentation", "f49999.pdf"));
  }
}
BENCHMARK(BM_FirstCallBuildsIndex)->Unit(benchmark::kMillisecond)->Iterations(5);

void BM_NameAfterFirstCall(benchmark::State& state) {
  SharedTree();
  TrovResetCaches();
  if (TrovSearch("TeX system documentation", "f25000.pdf") == nullptr)
    state.SkipWithError("not found");
  for (auto _ : state)
    benchmark::DoNotOptimize(TrovSearch("TeX system documentation", "f25000.pdf"));
}
BENCHMARK(BM_NameAfterFirstCall)->Unit(benchmark::kMicrosecond);

void BM_PatternAfterFirstCall(benchmark::State& state) {
  SharedTree();
  TrovResetCaches();
  if (TrovSearch("$TEXMF/doc//", "f25000.pdf") == nullptr) state.SkipWithError("not found");
  for (auto _ : state) benchmark::DoNotOptimize(TrovSearch("$TEXMF/doc//", "f25000.pdf"));
}
BENCHMARK(BM_PatternAfterFirstCall)->Unit(benchmark::kMicrosecond);

void BM_NameWithDirectories(benchmark::State& state) {
  SharedTree();
  TrovResetCaches();
  const char* name = "pkg250/sub0/f25000.pdf";
  if (TrovSearch("TeX system documentation", name) == nullptr) state.SkipWithError("not found");
  for (auto _ : state) benchmark::DoNotOptimize(TrovSearch("TeX system documentation", name));
}
BENCHMARK(BM_NameWithDirectories)->Unit(benchmark::kMicrosecond);

// The worst case for a name with directories: its base name is shared by 500
// files and the wanted one comes last in the index's order.
void BM_NameWithDirectoriesAmongSharedNames(benchmark::State& state) {
  SharedTree();
  TrovResetCaches();
  const char* name = "pkg99/README";
  if (TrovSearch("TeX system documentation", name) == nullptr) state.SkipWithError("not found");
  for (auto _ : state) benchmark::DoNotOptimize(TrovSearch("TeX system documentation", name));
}
BENCHMARK(BM_NameWithDirectoriesAmongSharedNames)->Unit(benchmark::kMicrosecond);

void BM_MissingName(benchmark::State& state) {
  SharedTree();
  TrovResetCaches();
  TrovSearch("TeX system documentation", "missing.pdf");
  for (auto _ : state)
    benchmark::DoNotOptimize(TrovSearch("TeX system documentation", "missing.pdf"));
}
BENCHMARK(BM_MissingName)->Unit(benchmark::kMicrosecond);

}  // namespace

BENCHMARK_MAIN();
