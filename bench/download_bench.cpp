// Transfer throughput: wxGet against `curl -o` for the same 16 MiB file from
// a loopback server, in the same run.
#include <benchmark/benchmark.h>
#include <spawn.h>
#include <sys/wait.h>

#include <cstdio>
#include <memory>
#include <string>

#include "access/download.h"
#include "http_test_server.h"
#include "test_support.h"

extern char** environ;

namespace {

constexpr std::size_t kSize = 16u << 20;

// What a dialog costs at least: nothing.
class NullProgress : public DownloadProgress {
 public:
  bool Update(int, const std::string&) override { return true; }
  void Resume() override {}
  bool AskAbortQuestion() override { return false; }
};

struct Fixture {
  testing_support::HttpTestServer server;
  testing_support::TempDir dir;
  Fixture() {
    testing_support::HttpReply reply;
    reply.body.assign(kSize, 'x');
    for (std::size_t i = 0; i < kSize; i += 997) reply.body[i] = static_cast<char>('a' + i % 26);
    server.Route("/big.pdf", reply);
  }
};

Fixture& Shared() {
  static Fixture fixture;
  return fixture;
}

void BM_WxGet(benchmark::State& state) {
  Fixture& f = Shared();
  const std::string url = f.server.Url("/big.pdf");
  const std::string path = f.dir / "wxget.pdf";
  NullProgress progress;
  for (auto _ : state) {
    int got = wxGet(progress, 0, 100, url.c_str(), path.c_str(), 16777216);
    if (got != static_cast<int>(kSize)) state.SkipWithError("short transfer");
  }
  state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * static_cast<int64_t>(kSize));
}
BENCHMARK(BM_WxGet)->Unit(benchmark::kMillisecond)->UseRealTime()->MinTime(2.0);

void BM_CurlTool(benchmark::State& state) {
  Fixture& f = Shared();
  const std::string url = f.server.Url("/big.pdf");
  const std::string path = f.dir / "curl.pdf";
  const char* argv[] = {"curl", "-s", "-o", path.c_str(), url.c_str(), nullptr};
  for (auto _ : state) {
    pid_t pid = 0;
    if (posix_spawnp(&pid, "curl", nullptr, nullptr, const_cast<char* const*>(argv), environ) !=
        0) {
      state.SkipWithError("curl cannot be started");
      break;
    }
    int status = 0;
    waitpid(pid, &status, 0);
    if (!WIFEXITED(status) || WEXITSTATUS(status) != 0) state.SkipWithError("curl failed");
  }
  state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * static_cast<int64_t>(kSize));
}
BENCHMARK(BM_CurlTool)->Unit(benchmark::kMillisecond)->UseRealTime()->MinTime(2.0);

}  // namespace

BENCHMARK_MAIN();
