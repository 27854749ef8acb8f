// The per-user instance lock.
#include "platform/instance_lock.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include "test_support.h"

namespace {

using testing_support::ScopedEnv;
using testing_support::TempDir;

const char* const kName = "Lomari-Docuvane-tester";

// A child holding the lock, and a program it started (which must not inherit it).
std::pair<pid_t, pid_t> StartHolder() {
  int ready[2], execed[2];  // `execed` closes in the program once it runs
  if (pipe(ready) != 0 || pipe2(execed, O_CLOEXEC) != 0) return {-1, -1};
  const pid_t pid = fork();
  if (pid == 0) {
    InstanceLock lock;
    if (!lock.Create(kName)) _exit(1);
    const pid_t viewer = fork();
    if (viewer == 0) execl("/bin/sleep", "sleep", "30", static_cast<char*>(nullptr));
    close(execed[1]);
    char byte;
    if (read(execed[0], &byte, 1) != 0 || write(ready[1], &viewer, sizeof viewer) != sizeof viewer)
      _exit(2);
    pause();
  }
  close(ready[1]);
  close(execed[1]);
  pid_t viewer = -1;
  const bool ok = read(ready[0], &viewer, sizeof viewer) == sizeof viewer;
  return {ok ? pid : -1, viewer};
}

// In the home directory whatever the runtime directory says; released by a killed holder.
TEST(InstanceLock, OnePerHomeUntilReleasedOrKilled) {
  TempDir home;
  ScopedEnv homeVar("HOME", home.path());
  ScopedEnv runtime("XDG_RUNTIME_DIR", home / "nowhere");
  const auto [holder, viewer] = StartHolder();
  ASSERT_GT(holder, 0);
  InstanceLock waiting;
  EXPECT_FALSE(waiting.Create(kName));
  EXPECT_TRUE(waiting.IsAnotherRunning());
  EXPECT_EQ(waiting.path(), home / (std::string(".") + kName + ".lock"));
  kill(holder, SIGKILL);
  waitpid(holder, nullptr, 0);
  ASSERT_TRUE(waiting.Create(kName));
  EXPECT_FALSE(InstanceLock().Create(kName));
  waiting.Release();
  EXPECT_TRUE(InstanceLock().Create(kName));
  kill(viewer, SIGKILL);
}

}  // namespace
