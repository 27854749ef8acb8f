// Forked, limited children for work that may crash or hang.
#include <errno.h>
#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <spawn.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <cstdio>
#include <vector>

#include "platform/worker.h"

extern char** environ;

namespace {

using Clock = std::chrono::steady_clock;

struct Running {
  std::size_t job = 0;
  pid_t pid = -1;
  int fd = -1;
  Clock::time_point deadline;
  std::string output;
  bool eof = false;
};

bool WriteAll(int fd, const std::string& data) {
  std::size_t done = 0;
  while (done < data.size()) {
    ssize_t n = write(fd, data.data() + done, data.size() - done);
    if (n < 0 && errno == EINTR) continue;
    if (n <= 0) return false;
    done += static_cast<std::size_t>(n);
  }
  return true;
}

void LimitChild(const IsolationLimits& limits) {
  if (limits.memoryBytes > 0) {
    rlimit memory{limits.memoryBytes, limits.memoryBytes};
    setrlimit(RLIMIT_AS, &memory);
  }
  // The parent kills at the deadline; this is for a parent that is gone.
  const rlim_t seconds = static_cast<rlim_t>(limits.timeoutMs / 1000 + 2);
  rlimit cpu{seconds, seconds + 1};
  setrlimit(RLIMIT_CPU, &cpu);
  rlimit core{0, 0};
  setrlimit(RLIMIT_CORE, &core);
}

bool Launch(std::size_t job, const IsolationLimits& limits,
            const std::function<std::string(std::size_t)>& work, Running& child) {
  int fds[2];
  if (pipe2(fds, O_CLOEXEC) != 0) return false;
  std::fflush(nullptr);
  pid_t pid = fork();
  if (pid < 0) {
    close(fds[0]);
    close(fds[1]);
    return false;
  }
  if (pid == 0) {
    close(fds[0]);
    LimitChild(limits);
    // Nothing may leave the child but its result: an exception unwinding
    // into the caller's code would go on running the caller in two copies.
    try {
      const std::string result = work(job);
      _exit(WriteAll(fds[1], result) ? 0 : 3);
    } catch (...) {
      _exit(4);
    }
  }
  close(fds[1]);
  fcntl(fds[0], F_SETFL, fcntl(fds[0], F_GETFL) | O_NONBLOCK);
  child.job = job;
  child.pid = pid;
  child.fd = fds[0];
  child.deadline = Clock::now() + std::chrono::milliseconds(limits.timeoutMs);
  child.output.clear();
  child.eof = false;
  return true;
}

void Drain(Running& child) {
  char buffer[65536];
  for (;;) {
    ssize_t n = read(child.fd, buffer, sizeof buffer);
    if (n > 0) {
      child.output.append(buffer, static_cast<std::size_t>(n));
      continue;
    }
    if (n < 0 && errno == EINTR) continue;
    if (n == 0) child.eof = true;
    return;
  }
}

IsolatedOutcome Reap(Running& child, bool killed) {
  IsolatedOutcome outcome;
  if (killed) kill(child.pid, SIGKILL);
  int status = 0;
  while (waitpid(child.pid, &status, 0) < 0 && errno == EINTR) {
  }
  close(child.fd);
  if (killed) {
    outcome.status = IsolatedOutcome::TimedOut;
  } else if (WIFSIGNALED(status)) {
    outcome.status =
        WTERMSIG(status) == SIGXCPU ? IsolatedOutcome::TimedOut : IsolatedOutcome::Crashed;
    outcome.signal = WTERMSIG(status);
  } else if (WIFEXITED(status) && WEXITSTATUS(status) == 0) {
    outcome.status = IsolatedOutcome::Done;
    outcome.output.swap(child.output);
  } else {
    outcome.status = IsolatedOutcome::Failed;
  }
  return outcome;
}

}  // namespace

bool RunIsolated(std::size_t count, const IsolationLimits& limits,
                 const std::function<std::string(std::size_t)>& job,
                 const std::function<bool(std::size_t, IsolatedOutcome&)>& done) {
  const std::size_t parallel = limits.parallel < 1 ? 1 : static_cast<std::size_t>(limits.parallel);
  std::vector<Running> running;
  std::size_t next = 0;
  bool stopped = false;
  while (!stopped && (next < count || !running.empty())) {
    while (next < count && running.size() < parallel) {
      Running child;
      if (Launch(next, limits, job, child)) {
        running.push_back(child);
      } else {
        IsolatedOutcome failed;
        if (!done(next, failed)) stopped = true;
      }
      ++next;
      if (stopped) break;
    }
    if (stopped || running.empty()) continue;

    std::vector<pollfd> polls;
    for (const Running& r : running) polls.push_back(pollfd{r.fd, POLLIN, 0});
    auto wait = std::chrono::duration_cast<std::chrono::milliseconds>(running.front().deadline -
                                                                      Clock::now());
    for (const Running& r : running)
      wait = std::min(
          wait, std::chrono::duration_cast<std::chrono::milliseconds>(r.deadline - Clock::now()));
    const int timeout =
        static_cast<int>(std::max<long long>(0, std::min<long long>(wait.count(), 1000)));
    if (poll(polls.data(), polls.size(), timeout) < 0 && errno != EINTR) break;

    const Clock::time_point now = Clock::now();
    for (std::size_t i = 0; i < running.size();) {
      Running& r = running[i];
      Drain(r);
      const bool late = !r.eof && now >= r.deadline;
      if (r.eof || late) {
        IsolatedOutcome outcome = Reap(r, late);
        const std::size_t which = r.job;
        running.erase(running.begin() + static_cast<long>(i));
        if (!done(which, outcome)) {
          stopped = true;
          break;
        }
      } else {
        ++i;
      }
    }
  }
  for (Running& r : running) Reap(r, true);
  return !stopped;
}

int ProcessorCount() {
  const long n = sysconf(_SC_NPROCESSORS_ONLN);
  return n < 1 ? 1 : static_cast<int>(n);
}

bool StandardErrorIsTerminal() { return isatty(2) == 1; }

ChildProgram::~ChildProgram() { Stop(); }

bool ChildProgram::Start(const char* const* argv) {
  int fds[2];
  if (pipe2(fds, O_CLOEXEC) != 0) return false;
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_addopen(&actions, 0, "/dev/null", O_RDONLY, 0);
  posix_spawn_file_actions_adddup2(&actions, fds[1], 1);
  pid_t pid = 0;
  const int rc =
      posix_spawnp(&pid, argv[0], &actions, nullptr, const_cast<char* const*>(argv), environ);
  posix_spawn_file_actions_destroy(&actions);
  close(fds[1]);
  if (rc != 0) {
    close(fds[0]);
    return false;
  }
  pid_ = pid;
  fd_ = fds[0];
  eof_ = false;
  pending_.clear();
  return true;
}

bool ChildProgram::ReadLine(std::string& line, int timeoutMs) {
  const Clock::time_point deadline = Clock::now() + std::chrono::milliseconds(timeoutMs);
  for (;;) {
    const std::size_t newline = pending_.find('\n');
    if (newline != std::string::npos) {
      line = pending_.substr(0, newline);
      pending_.erase(0, newline + 1);
      return true;
    }
    if (eof_ || fd_ < 0) return false;
    const auto left =
        std::chrono::duration_cast<std::chrono::milliseconds>(deadline - Clock::now()).count();
    if (left <= 0) return false;
    pollfd p{fd_, POLLIN, 0};
    const int ready = poll(&p, 1, static_cast<int>(left));
    if (ready < 0 && errno == EINTR) continue;
    if (ready <= 0) return false;
    char buffer[4096];
    const ssize_t n = read(fd_, buffer, sizeof buffer);
    if (n < 0 && errno == EINTR) continue;
    if (n <= 0) {
      eof_ = true;
      if (!pending_.empty()) {
        line.swap(pending_);
        pending_.clear();
        return true;
      }
      return false;
    }
    pending_.append(buffer, static_cast<std::size_t>(n));
  }
}

void ChildProgram::Stop() {
  if (pid_ < 0) return;
  kill(pid_, SIGTERM);
  for (int i = 0; i < 100; ++i) {
    int status = 0;
    if (waitpid(pid_, &status, WNOHANG) == pid_) {
      pid_ = -1;
      break;
    }
    usleep(20000);
  }
  if (pid_ >= 0) {
    kill(pid_, SIGKILL);
    int status = 0;
    waitpid(pid_, &status, 0);
    pid_ = -1;
  }
  if (fd_ >= 0) close(fd_);
  fd_ = -1;
}

int ChildProgram::Wait() {
  if (pid_ < 0) return -1;
  int status = 0;
  while (waitpid(pid_, &status, 0) < 0 && errno == EINTR) {
  }
  pid_ = -1;
  if (fd_ >= 0) close(fd_);
  fd_ = -1;
  return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}
