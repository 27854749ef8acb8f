// Forked, limited worker processes for work that may crash or hang.
#include <errno.h>
#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <deque>
#include <vector>

#include "platform/exec.h"
#include "platform/worker.h"

namespace {

using Clock = std::chrono::steady_clock;

// A worker is replaced after this many jobs, so what jobs leave behind
// cannot pile up.
constexpr std::size_t kJobsPerWorker = 64;

// A worker: a forked child that runs the jobs it is sent one at a time
// over a socket (8 bytes, the job's number) and answers each with its
// number, the result's length and the result.
struct Worker {
  pid_t pid = -1;
  int fd = -1;
  bool busy = false;
  std::size_t job = 0;
  std::size_t ran = 0;  // jobs sent to it so far
  Clock::time_point deadline;
  std::string input;  // answer bytes not yet complete
};

bool WriteAll(int fd, const void* data, std::size_t size) {
  const char* bytes = static_cast<const char*>(data);
  std::size_t done = 0;
  while (done < size) {
    const ssize_t n = send(fd, bytes + done, size - done, MSG_NOSIGNAL);
    if (n < 0 && errno == EINTR) continue;
    if (n <= 0) return false;
    done += static_cast<std::size_t>(n);
  }
  return true;
}

bool ReadAll(int fd, void* data, std::size_t size) {
  char* bytes = static_cast<char*>(data);
  std::size_t done = 0;
  while (done < size) {
    const ssize_t n = read(fd, bytes + done, size - done);
    if (n < 0 && errno == EINTR) continue;
    if (n <= 0) return false;
    done += static_cast<std::size_t>(n);
  }
  return true;
}

double CpuSeconds() {
  rusage usage{};
  getrusage(RUSAGE_SELF, &usage);
  return static_cast<double>(usage.ru_utime.tv_sec + usage.ru_stime.tv_sec) +
         static_cast<double>(usage.ru_utime.tv_usec + usage.ru_stime.tv_usec) / 1e6;
}

// The parent kills a job at its deadline; the processor time limit, moved
// on before every job, is for a parent that is gone.
void LimitCpu(const IsolationLimits& limits) {
  rlimit cpu{};
  getrlimit(RLIMIT_CPU, &cpu);
  const rlim_t seconds =
      static_cast<rlim_t>(CpuSeconds()) + static_cast<rlim_t>(limits.timeoutMs / 1000 + 2);
  cpu.rlim_cur = cpu.rlim_max == RLIM_INFINITY ? seconds : std::min(seconds, cpu.rlim_max);
  setrlimit(RLIMIT_CPU, &cpu);
}

#if defined(__SANITIZE_ADDRESS__)
constexpr bool kAddressSanitizer = true;
#elif defined(__has_feature)
#if __has_feature(address_sanitizer)
constexpr bool kAddressSanitizer = true;
#else
constexpr bool kAddressSanitizer = false;
#endif
#else
constexpr bool kAddressSanitizer = false;
#endif

[[noreturn]] void Serve(int fd, const IsolationLimits& limits,
                        const std::function<std::string(std::size_t)>& work) {
  // An address-space limit would starve AddressSanitizer's shadow memory,
  // which reserves terabytes up front; sanitized test builds go without it.
  if (limits.memoryBytes > 0 && !kAddressSanitizer) {
    rlimit memory{limits.memoryBytes, limits.memoryBytes};
    setrlimit(RLIMIT_AS, &memory);
  }
  rlimit core{0, 0};
  setrlimit(RLIMIT_CORE, &core);
  // Nothing may leave the child but its results: an exception unwinding
  // into the caller's code would go on running the caller in two copies.
  try {
    std::uint64_t job = 0;
    while (ReadAll(fd, &job, sizeof job)) {
      LimitCpu(limits);
      const std::string result = work(static_cast<std::size_t>(job));
      const std::uint64_t head[2] = {job, result.size()};
      if (!WriteAll(fd, head, sizeof head) || !WriteAll(fd, result.data(), result.size())) _exit(3);
    }
    _exit(0);
  } catch (...) {
    _exit(4);
  }
}

// `others`: the sockets of the other workers, which the new one must not
// keep open (a worker sees the end of its jobs when its socket closes).
bool Start(const IsolationLimits& limits, const std::function<std::string(std::size_t)>& work,
           const std::vector<Worker>& others, Worker& worker) {
  int fds[2];
  if (socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, fds) != 0) return false;
  std::fflush(nullptr);
  const pid_t pid = fork();
  if (pid < 0) {
    close(fds[0]);
    close(fds[1]);
    return false;
  }
  if (pid == 0) {
    close(fds[0]);
    for (const Worker& other : others)
      if (other.fd >= 0) close(other.fd);
    Serve(fds[1], limits, work);
  }
  close(fds[1]);
  fcntl(fds[0], F_SETFL, fcntl(fds[0], F_GETFL) | O_NONBLOCK);
  worker = Worker();
  worker.pid = pid;
  worker.fd = fds[0];
  return true;
}

// Ends a worker (killing it first when `kill`), and tells how its current
// job ended when it had one.
IsolatedOutcome Stop(Worker& worker, bool killIt) {
  IsolatedOutcome outcome;
  if (killIt) kill(worker.pid, SIGKILL);
  close(worker.fd);
  int status = 0;
  while (waitpid(worker.pid, &status, 0) < 0 && errno == EINTR) {
  }
  worker.pid = -1;
  worker.fd = -1;
  if (killIt) {
    outcome.status = IsolatedOutcome::TimedOut;
  } else if (WIFSIGNALED(status)) {
    outcome.status =
        WTERMSIG(status) == SIGXCPU ? IsolatedOutcome::TimedOut : IsolatedOutcome::Crashed;
    outcome.signal = WTERMSIG(status);
  } else {
    outcome.status = IsolatedOutcome::Failed;
  }
  return outcome;
}

// Reads what the worker sent; true when its current job's answer is
// complete (`output` set), `ended` when the worker is gone.
bool Receive(Worker& worker, std::string& output, bool& ended) {
  char buffer[65536];
  for (;;) {
    const ssize_t n = read(worker.fd, buffer, sizeof buffer);
    if (n > 0) {
      worker.input.append(buffer, static_cast<std::size_t>(n));
      continue;
    }
    if (n < 0 && errno == EINTR) continue;
    ended = n == 0 || (errno != EAGAIN && errno != EWOULDBLOCK);
    break;
  }
  std::uint64_t head[2];
  if (worker.input.size() < sizeof head) return false;
  std::memcpy(head, worker.input.data(), sizeof head);
  if (head[0] != worker.job || head[1] > worker.input.size() - sizeof head) return false;
  output = worker.input.substr(sizeof head, head[1]);
  worker.input.erase(0, sizeof head + head[1]);
  return true;
}

}  // namespace

bool RunIsolated(std::size_t count, const IsolationLimits& limits,
                 const std::function<std::string(std::size_t)>& job,
                 const std::function<bool(std::size_t, IsolatedOutcome&)>& done) {
  const std::size_t parallel = limits.parallel < 1 ? 1 : static_cast<std::size_t>(limits.parallel);
  std::deque<std::size_t> queue;
  for (std::size_t i = 0; i < count; ++i) queue.push_back(i);
  std::vector<bool> retried(count);
  std::vector<Worker> workers(std::min(parallel, count));
  bool stopped = false;
  auto finish = [&](std::size_t which, IsolatedOutcome& outcome) {
    if (!done(which, outcome)) stopped = true;
  };
  // A job that fails in a worker that had run others before is run once
  // more in a fresh one: what the earlier jobs left behind (memory, the PDF
  // library's state) must not be what skips a document.
  auto ended = [&](Worker& w, bool late) {
    IsolatedOutcome outcome = Stop(w, late);
    if (!w.busy) return;
    w.busy = false;
    if (!late && w.ran > 1 && !retried[w.job]) {
      retried[w.job] = true;
      queue.push_front(w.job);
      return;
    }
    finish(w.job, outcome);
  };

  for (;;) {
    for (Worker& w : workers) {
      if (stopped || w.busy || queue.empty()) continue;
      if (w.pid >= 0 && w.ran >= kJobsPerWorker) Stop(w, false);
      if (w.pid < 0 && !Start(limits, job, workers, w)) {
        IsolatedOutcome failed;
        const std::size_t which = queue.front();
        queue.pop_front();
        finish(which, failed);
        continue;
      }
      const std::uint64_t next = queue.front();
      if (!WriteAll(w.fd, &next, sizeof next)) {
        ended(w, false);
        continue;
      }
      queue.pop_front();
      w.busy = true;
      w.job = static_cast<std::size_t>(next);
      ++w.ran;
      w.deadline = Clock::now() + std::chrono::milliseconds(limits.timeoutMs);
    }
    std::vector<pollfd> polls;
    std::vector<Worker*> polled;
    Clock::time_point first = Clock::time_point::max();
    for (Worker& w : workers)
      if (w.busy) {
        polls.push_back(pollfd{w.fd, POLLIN, 0});
        polled.push_back(&w);
        first = std::min(first, w.deadline);
      }
    if (stopped || (polls.empty() && queue.empty())) break;
    if (polls.empty()) continue;  // a worker went away before its job; start another
    const auto wait =
        std::chrono::duration_cast<std::chrono::milliseconds>(first - Clock::now()).count();
    const int timeout = static_cast<int>(std::max<long long>(0, std::min<long long>(wait, 1000)));
    if (poll(polls.data(), polls.size(), timeout) < 0 && errno != EINTR) break;

    const Clock::time_point now = Clock::now();
    for (std::size_t i = 0; i < polled.size() && !stopped; ++i) {
      Worker& w = *polled[i];
      if (polls[i].revents == 0 && now < w.deadline) continue;
      IsolatedOutcome outcome;
      bool gone = false;
      if (Receive(w, outcome.output, gone)) {
        w.busy = false;
        outcome.status = IsolatedOutcome::Done;
        finish(w.job, outcome);
        continue;
      }
      if (gone || now >= w.deadline) ended(w, !gone);
    }
  }
  for (Worker& w : workers)
    if (w.pid >= 0) Stop(w, w.busy);
  return !stopped;
}

int ProcessorCount() {
  const long n = sysconf(_SC_NPROCESSORS_ONLN);
  return n < 1 ? 1 : static_cast<int>(n);
}

bool StandardErrorIsTerminal() { return isatty(2) == 1; }

ChildProgram::~ChildProgram() { Stop(); }

bool ChildProgram::Start(const char* const* argv) {
  int pid = 0, fd = -1;
  if (!SpawnWithOutputPipe(argv, false, &pid, &fd)) return false;
  pid_ = pid;
  fd_ = fd;
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
