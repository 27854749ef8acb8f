// The per-user instance lock.
#include "platform/instance_lock.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include "test_support.h"

namespace {

using testing_support::MessageCapture;
using testing_support::ScopedEnv;
using testing_support::TempDir;

const char* const kName = "Lomari-Docuvane-tester";

// A child process that takes the lock, reports it through a pipe and waits
// to be killed.  Returns its pid, or -1.
pid_t StartHolder(const std::string& dir) {
  int ready[2];
  if (pipe(ready) != 0) return -1;
  const pid_t pid = fork();
  if (pid == 0) {
    close(ready[0]);
    InstanceLock lock;
    const char answer = lock.Create(kName, dir) ? 'y' : 'n';
    if (write(ready[1], &answer, 1) != 1) _exit(2);
    pause();
    _exit(0);
  }
  close(ready[1]);
  char answer = 0;
  const bool ok = read(ready[0], &answer, 1) == 1 && answer == 'y';
  close(ready[0]);
  if (!ok && pid > 0) {
    kill(pid, SIGKILL);
    waitpid(pid, nullptr, 0);
    return -1;
  }
  return pid;
}

TEST(InstanceLock, OneHolderAtATime) {
  TempDir dir;
  InstanceLock first;
  ASSERT_TRUE(first.Create(kName, dir.path()));
  EXPECT_FALSE(first.IsAnotherRunning());
  EXPECT_TRUE(first.HoldsLock());

  InstanceLock second;
  EXPECT_FALSE(second.Create(kName, dir.path()));
  EXPECT_TRUE(second.IsAnotherRunning());

  InstanceLock otherUser;  // another name: another user's lock
  EXPECT_TRUE(otherUser.Create("Lomari-Docuvane-someone", dir.path()));

  first.Release();
  EXPECT_TRUE(second.Create(kName, dir.path()));
  EXPECT_FALSE(second.IsAnotherRunning());
}

TEST(InstanceLock, LeftoverFilesNeverBlock) {
  struct Row {
    const char* what;
    std::string content;
  };
  const Row rows[] = {
      {"an empty lock file", ""},
      {"a lock file naming a live process of this user", std::to_string(getppid()) + "\n"},
      {"a lock file naming no process", "999999999\n"},
      {"garbage", "\x01\x02not a pid"},
  };
  for (const Row& row : rows) {
    TempDir dir;
    dir.Write(std::string(kName) + ".lock", row.content);
    InstanceLock lock;
    EXPECT_TRUE(lock.Create(kName, dir.path())) << row.what;
    EXPECT_FALSE(lock.IsAnotherRunning()) << row.what;
  }
}

TEST(InstanceLock, KilledHolderReleasesTheLock) {
  TempDir dir;
  const pid_t holder = StartHolder(dir.path());
  ASSERT_GT(holder, 0);

  InstanceLock waiting;
  EXPECT_FALSE(waiting.Create(kName, dir.path()));
  EXPECT_TRUE(waiting.IsAnotherRunning());

  kill(holder, SIGKILL);
  waitpid(holder, nullptr, 0);
  EXPECT_TRUE(waiting.Create(kName, dir.path()));
  EXPECT_FALSE(waiting.IsAnotherRunning());
}

TEST(InstanceLock, ProgramsStartedByTheHolderDoNotKeepIt) {
  TempDir dir;
  InstanceLock lock;
  ASSERT_TRUE(lock.Create(kName, dir.path()));
  // The pipe closes in the child when exec has happened.
  int execed[2];
  ASSERT_EQ(pipe2(execed, O_CLOEXEC), 0);
  const pid_t viewer = fork();
  if (viewer == 0) {
    execl("/bin/sleep", "sleep", "30", static_cast<char*>(nullptr));
    _exit(127);
  }
  ASSERT_GT(viewer, 0);
  close(execed[1]);
  char byte;
  ASSERT_EQ(read(execed[0], &byte, 1), 0);
  close(execed[0]);
  lock.Release();

  InstanceLock next;
  EXPECT_TRUE(next.Create(kName, dir.path()));
  kill(viewer, SIGKILL);
  waitpid(viewer, nullptr, 0);
}

TEST(InstanceLock, UnusableLockPlaceLetsTheProgramStart) {
  struct Row {
    const char* what;
    bool symlink;  // a link at the lock path; else a refused runtime directory
  };
  const Row rows[] = {{"a symbolic link at the lock path", true},
                      {"a runtime directory open to others", false}};
  for (const Row& row : rows) {
    TempDir dir;
    MessageCapture capture;
    InstanceLock lock;
    if (row.symlink) {
      ASSERT_EQ(
          symlink((dir / "elsewhere").c_str(), (dir / (std::string(kName) + ".lock")).c_str()), 0);
      EXPECT_FALSE(lock.Create(kName, dir.path())) << row.what;
    } else {
      ScopedEnv runtime("XDG_RUNTIME_DIR", dir.path());
      ASSERT_EQ(mkdir((dir / "lomari").c_str(), 0755), 0);
      chmod((dir / "lomari").c_str(), 0755);
      EXPECT_FALSE(lock.Create(kName)) << row.what;
    }
    EXPECT_FALSE(lock.IsAnotherRunning()) << row.what;
    EXPECT_FALSE(lock.HoldsLock()) << row.what;
    EXPECT_EQ(capture.LevelOf("ERROR: "), 5) << row.what;
  }
}

TEST(InstanceLock, DefaultPlaceIsTheRuntimeDirectory) {
  TempDir dir;
  ScopedEnv runtime("XDG_RUNTIME_DIR", dir.path());
  InstanceLock lock;
  ASSERT_TRUE(lock.Create(kName));
  EXPECT_EQ(lock.path(), dir.path() + "/lomari/" + kName + ".lock");
  struct stat st;
  ASSERT_EQ(stat(lock.path().c_str(), &st), 0);
  EXPECT_EQ(st.st_mode & 0777, 0600u);
}

}  // namespace
