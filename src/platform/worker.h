// Running work where a crash, a hang or a runaway allocation cannot reach
// the caller: jobs run in child processes, with a time limit per job and an
// address-space limit, and hand their results back through a socket.
#pragma once

#include <cstddef>
#include <functional>
#include <string>

struct IsolatedOutcome {
  enum Status { Done, Crashed, TimedOut, Failed };
  Status status = Failed;
  int signal = 0;      // for Crashed: the signal that ended the child
  std::string output;  // for Done: what the job returned
};

struct IsolationLimits {
  int parallel = 1;                    // children at once
  int timeoutMs = 60000;               // wall time per job
  std::size_t memoryBytes = 1u << 30;  // address space per worker; 0 = no limit
};

// Runs job(i) for i in [0, count), in order of i, in forked worker
// processes, at most `limits.parallel` at a time; each worker runs one job
// after another (a new worker is started after a crash, a timeout, or a
// few dozen jobs), and a job that fails in a worker that had run others is
// run once more in a fresh one.  `done(i, outcome)` is called in the
// caller's process as each job ends, in the order they end.  `done`
// returning false stops the run: running workers are killed and no more
// jobs are started.  Returns false when the run was stopped.  The job must
// not rely on threads of the caller; it runs in a copy of the process made
// by fork.
bool RunIsolated(std::size_t count, const IsolationLimits& limits,
                 const std::function<std::string(std::size_t)>& job,
                 const std::function<bool(std::size_t, IsolatedOutcome&)>& done);

// Number of processors this process may use (at least 1).
int ProcessorCount();

// True when standard error is a terminal (a progress line may be redrawn).
bool StandardErrorIsTerminal();

// A child program whose standard output is read line by line, for tools
// run from the window (the scanner).  Standard error is passed through.
class ChildProgram {
 public:
  ChildProgram() = default;
  ~ChildProgram();
  ChildProgram(const ChildProgram&) = delete;
  ChildProgram& operator=(const ChildProgram&) = delete;

  bool Start(const char* const* argv);
  // Waits at most `timeoutMs` for a whole line; true with `line` set when
  // one came, false on timeout or at the end of the output (see Ended).
  bool ReadLine(std::string& line, int timeoutMs);
  bool Ended() const { return eof_; }
  // Stops the program (SIGTERM, then SIGKILL) and reaps it.
  void Stop();
  // Waits for the end; the exit status, or -1 when killed by a signal.
  int Wait();

 private:
  int pid_ = -1;
  int fd_ = -1;
  bool eof_ = false;
  std::string pending_;
};
