// The file-type association of the desktop, through xdg-mime and the
// desktop entries of the XDG data directories (platform/desktop_entry.h).
#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <string>
#include <vector>

#include "platform/desktop_entry.h"
#include "platform/exec.h"
#include "platform/findexec.h"
#include "platform/winapi.h"
#include "text/text.h"

namespace {

constexpr int kHelperTimeoutMs = 5000;
constexpr std::size_t kMaxHelperOutput = 64 * 1024;

bool IsExecutableFile(const std::string& path) {
  struct stat st;
  return stat(path.c_str(), &st) == 0 && S_ISREG(st.st_mode) && access(path.c_str(), X_OK) == 0;
}

}  // namespace

std::string FindOnPath(const std::string& program) {
  if (program.empty()) return std::string();
  if (program.find('/') != std::string::npos)
    return IsExecutableFile(program) ? program : std::string();
  const char* path = std::getenv("PATH");
  std::string dirs = path ? path : "/usr/local/bin:/usr/bin:/bin";
  std::size_t start = 0;
  while (start <= dirs.size()) {
    std::size_t end = dirs.find(':', start);
    if (end == std::string::npos) end = dirs.size();
    std::string dir = dirs.substr(start, end - start);
    if (dir.empty()) dir = ".";
    std::string candidate = dir + "/" + program;
    if (IsExecutableFile(candidate)) return candidate;
    start = end + 1;
  }
  return std::string();
}

bool RunAndCapture(const char* const* argv, std::string& output, int timeoutMs) {
  output.clear();
  int pid = 0, fd = -1;
  if (!SpawnWithOutputPipe(argv, true, &pid, &fd)) return false;

  auto deadline = std::chrono::steady_clock::now() + std::chrono::milliseconds(timeoutMs);
  bool timedOut = false;
  char buffer[4096];
  for (;;) {
    auto left = std::chrono::duration_cast<std::chrono::milliseconds>(
                    deadline - std::chrono::steady_clock::now())
                    .count();
    if (left <= 0) {
      timedOut = true;
      break;
    }
    pollfd p{fd, POLLIN, 0};
    int ready = poll(&p, 1, static_cast<int>(left));
    if (ready < 0 && errno == EINTR) continue;
    if (ready <= 0) {
      timedOut = ready == 0;
      break;
    }
    ssize_t got = read(fd, buffer, sizeof buffer);
    if (got < 0 && errno == EINTR) continue;
    if (got <= 0) break;
    if (output.size() < kMaxHelperOutput) output.append(buffer, static_cast<std::size_t>(got));
  }
  close(fd);
  if (timedOut) kill(pid, SIGKILL);
  // A helper may close its output and linger: the deadline holds here too.
  int status = 0;
  for (;;) {
    pid_t r = waitpid(pid, &status, timedOut ? 0 : WNOHANG);
    if (r == pid) break;
    if (r < 0) {
      if (errno == EINTR) continue;
      return false;
    }
    if (std::chrono::steady_clock::now() >= deadline) {
      kill(pid, SIGKILL);
      timedOut = true;
    } else {
      usleep(5000);
    }
  }
  return !timedOut && WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

std::string FindExecutable(const std::string& path) {
  if (path.empty() || access(path.c_str(), F_OK) != 0) return std::string();

  std::string output;
  const char* filetype[] = {"xdg-mime", "query", "filetype", path.c_str(), nullptr};
  if (!RunAndCapture(filetype, output, kHelperTimeoutMs)) return std::string();
  std::string mime = TrimBlanks(output);
  if (mime.empty() || mime.find('\n') != std::string::npos) return std::string();

  DesktopEntry entry;
  if (!ReadDesktopEntry(DefaultApplicationId(mime), entry)) return std::string();
  std::vector<std::string> words = SplitDesktopExec(entry.exec);
  std::size_t first = 0;
  if (first < words.size() && words[first] == "env") {
    ++first;
    while (first < words.size() && words[first].find('=') != std::string::npos) ++first;
  }
  if (first >= words.size()) return std::string();
  return FindOnPath(words[first]);
}

UINT_PTR FindExecutableA(const char* file, const char* /*directory*/, char* result) {
  // Windows' result buffer holds MAX_PATH characters.
  constexpr std::size_t kResultSize = 260;
  if (result != nullptr) result[0] = '\0';
  const std::string program = FindExecutable(file != nullptr ? file : "");
  if (program.empty() || result == nullptr) return 31;  // SE_ERR_NOASSOC
  if (program.size() >= kResultSize) return 2;          // too long: not found
  program.copy(result, program.size());
  result[program.size()] = '\0';
  return 33;
}
