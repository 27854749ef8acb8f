// The per-user instance lock.
#include "platform/instance_lock.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <functional>
#include <utility>

#include "test_support.h"

namespace {

using testing_support::MessageCapture;
using testing_support::ScopedEnv;
using testing_support::TempDir;

const char* const kName = "Lomari-Docuvane-tester";

// A child that holds the lock and has started a program of its own, which
// must not inherit the lock.  Its pid and the program's, or -1 when the child
// could not take the lock.
std::pair<pid_t, pid_t> StartHolder(const std::string& dir) {
  int ready[2];
  if (pipe(ready) != 0) return {-1, -1};
  const pid_t pid = fork();
  if (pid == 0) {
    InstanceLock lock;
    pid_t viewer = -1;
    int execed[2];  // closes in the program when exec has happened
    if (!lock.Create(kName, dir) || pipe2(execed, O_CLOEXEC) != 0) _exit(1);
    if ((viewer = fork()) == 0) execl("/bin/sleep", "sleep", "30", static_cast<char*>(nullptr));
    close(execed[1]);
    char byte;
    if (read(execed[0], &byte, 1) != 0 || write(ready[1], &viewer, sizeof viewer) != sizeof viewer)
      _exit(2);
    pause();
  }
  close(ready[1]);
  pid_t viewer = -1;
  const bool ok = read(ready[0], &viewer, sizeof viewer) == sizeof viewer;
  close(ready[0]);
  return {ok ? pid : -1, viewer};
}

TEST(InstanceLock, OneHolderAtATimeUntilReleasedOrKilled) {
  TempDir dir;
  const auto [holder, viewer] = StartHolder(dir.path());
  ASSERT_GT(holder, 0);
  InstanceLock waiting;
  EXPECT_FALSE(waiting.Create(kName, dir.path()));
  EXPECT_TRUE(waiting.IsAnotherRunning());
  InstanceLock otherUser;  // another name: another user's lock
  EXPECT_TRUE(otherUser.Create("Lomari-Docuvane-someone", dir.path()));

  kill(holder, SIGKILL);  // the program it started lives on
  waitpid(holder, nullptr, 0);
  ASSERT_TRUE(waiting.Create(kName, dir.path()));
  EXPECT_FALSE(waiting.IsAnotherRunning());
  EXPECT_TRUE(waiting.HoldsLock());

  InstanceLock next;
  EXPECT_FALSE(next.Create(kName, dir.path()));
  waiting.Release();
  EXPECT_TRUE(next.Create(kName, dir.path()));
  kill(viewer, SIGKILL);
}

TEST(InstanceLock, LeftoverFilesNeverBlockAndUnusablePlacesLetTheProgramStart) {
  struct Row {
    const char* what;
    std::function<void(const std::string& lockPath)> prepare;
    bool taken;
  };
  const auto content = [](std::string text) {
    return [text](const std::string& path) { std::ofstream(path) << text; };
  };
  const Row rows[] = {
      {"no lock file", [](const std::string&) {}, true},
      {"an empty lock file", content(""), true},
      {"a lock file naming a live process of this user", content(std::to_string(getppid())), true},
      {"a lock file naming no process", content("999999999\n"), true},
      {"garbage", content("\x01\x02not a pid"), true},
      {"a symbolic link at the lock path",
       [](const std::string& path) {
         EXPECT_EQ(symlink((path + "-elsewhere").c_str(), path.c_str()), 0);
       },
       false},
      {"a runtime directory open to others",
       [](const std::string& path) { chmod(path.substr(0, path.rfind('/')).c_str(), 0755); },
       false},
  };
  for (const Row& row : rows) {
    TempDir dir;
    ScopedEnv runtime("XDG_RUNTIME_DIR", dir.path());
    const std::string path = dir.path() + "/lomari/" + kName + ".lock";
    ASSERT_EQ(mkdir((dir / "lomari").c_str(), 0700), 0);
    row.prepare(path);
    const bool fresh = !std::filesystem::exists(path);
    MessageCapture capture;
    InstanceLock lock;
    EXPECT_EQ(lock.Create(kName), row.taken) << row.what;
    EXPECT_EQ(lock.HoldsLock(), row.taken) << row.what;
    EXPECT_FALSE(lock.IsAnotherRunning()) << row.what;
    EXPECT_EQ(capture.LevelOf("ERROR: "), row.taken ? -1 : 5) << row.what;
    struct stat st;
    if (row.taken) {
      EXPECT_EQ(lock.path(), path);
      ASSERT_EQ(stat(path.c_str(), &st), 0) << row.what;
      EXPECT_TRUE(!fresh || (st.st_mode & 0777) == 0600) << "a new lock file is private";
    }
  }
}

}  // namespace
