#include "vornplatform/lock.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <string>

#include "support/test_util.h"
#include "vornplatform/err.h"

namespace {

using vorntest::Exists;
using vorntest::TempDir;

// What VLIBCFileLockByFile gives in another process.
int LockInChild(const std::string& path, int exclusive) {
  pid_t pid = fork();
  if (pid == 0) {
    int fd = -1;
    const int rc = VLIBCFileLockByFile(path.c_str(), exclusive, &fd);
    _exit(rc < 0 ? 99 : rc);
  }
  int status = 0;
  waitpid(pid, &status, 0);
  return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

class LockTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_FALSE(dir_.path().empty());
    path_ = dir_ / "x.lock";
    VLIBCErrClear();
  }
  void TearDown() override { VLIBCFileCloseLock(); }
  TempDir dir_;
  std::string path_;
};

TEST_F(LockTest, ExclusiveLockIsCreatedAndHeld) {
  int fd = -1;
  EXPECT_EQ(VLIBCFileLockByFile(path_.c_str(), 1, &fd), 1);
  EXPECT_GE(fd, 0);
  EXPECT_TRUE(Exists(path_));
  EXPECT_NE(fcntl(fd, F_GETFD) & FD_CLOEXEC, 0);
  int fd2 = 123;
  EXPECT_EQ(VLIBCFileLockByFile(path_.c_str(), 1, &fd2), 0);
  EXPECT_EQ(fd2, -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_BUSY);
  EXPECT_EQ(VLIBCFileUnlockByFile(fd), 1);
  EXPECT_EQ(VLIBCFileLockByFile(path_.c_str(), 1, &fd2), 1);
  EXPECT_EQ(VLIBCFileUnlockByFile(fd2), 1);
}

TEST_F(LockTest, SharedLocksCoexistButExcludeAWriter) {
  int a = -1, b = -1, c = -1;
  EXPECT_EQ(VLIBCFileLockByFile(path_.c_str(), 0, &a), 1);
  EXPECT_EQ(VLIBCFileLockByFile(path_.c_str(), 0, &b), 1);
  EXPECT_EQ(VLIBCFileLockByFile(path_.c_str(), 1, &c), 0);
  EXPECT_EQ(LockInChild(path_, 0), 1);
  EXPECT_EQ(LockInChild(path_, 1), 0);
  EXPECT_EQ(VLIBCFileUnlockByFile(a), 1);
  EXPECT_EQ(VLIBCFileUnlockByFile(b), 1);
  EXPECT_EQ(LockInChild(path_, 1), 1);
}

TEST_F(LockTest, ExcludesOtherProcessesUntilUnlocked) {
  int fd = -1;
  ASSERT_EQ(VLIBCFileLockByFile(path_.c_str(), 1, &fd), 1);
  EXPECT_EQ(LockInChild(path_, 1), 0);
  EXPECT_EQ(LockInChild(path_, 0), 0);
  EXPECT_EQ(VLIBCFileUnlockByFile(fd), 1);
  EXPECT_EQ(LockInChild(path_, 1), 1);
}

TEST_F(LockTest, AProgramRunByAChildDoesNotKeepTheLock) {
  int fd = -1;
  ASSERT_EQ(VLIBCFileLockByFile(path_.c_str(), 1, &fd), 1);
  pid_t sleeper = fork();
  if (sleeper == 0) {
    execl("/bin/sleep", "sleep", "30", static_cast<char*>(nullptr));
    _exit(127);
  }
  usleep(100000);
  EXPECT_EQ(VLIBCFileUnlockByFile(fd), 1);
  EXPECT_EQ(LockInChild(path_, 1), 1);
  kill(sleeper, SIGKILL);
  waitpid(sleeper, nullptr, 0);
}

TEST_F(LockTest, CloseLockClosesEveryLockDescriptor) {
  int a = -1, b = -1;
  ASSERT_EQ(VLIBCFileLockByFile(path_.c_str(), 1, &a), 1);
  ASSERT_EQ(VLIBCFileLockByFile((dir_ / "y.lock").c_str(), 1, &b), 1);
  // In a forked child (as before an exec): the descriptors go, the parent's locks stay.
  pid_t pid = fork();
  if (pid == 0) {
    VLIBCFileCloseLock();
    const bool closed = fcntl(a, F_GETFD) < 0 && fcntl(b, F_GETFD) < 0;
    _exit(closed ? 0 : 1);
  }
  int status = 0;
  waitpid(pid, &status, 0);
  ASSERT_TRUE(WIFEXITED(status));
  EXPECT_EQ(WEXITSTATUS(status), 0);
  EXPECT_EQ(LockInChild(path_, 1), 0);
  // In this process the locks are released with their descriptors.
  EXPECT_EQ(VLIBCFileCloseLock(), 0);
  EXPECT_LT(fcntl(a, F_GETFD), 0);
  EXPECT_EQ(LockInChild(path_, 1), 1);
  EXPECT_EQ(LockInChild(dir_ / "y.lock", 1), 1);
  EXPECT_EQ(VLIBCFileUnlockByFile(a), 0);
}

TEST_F(LockTest, BadParameters) {
  int fd = 5;
  EXPECT_EQ(VLIBCFileLockByFile(nullptr, 1, &fd), -1);
  EXPECT_EQ(fd, -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_BAD_PARAMETER);
  EXPECT_EQ(VLIBCFileLockByFile("", 1, &fd), -1);
  EXPECT_EQ(VLIBCFileLockByFile(path_.c_str(), 1, nullptr), -1);
  EXPECT_EQ(VLIBCFileLockByFile((dir_ / "nodir/x.lock").c_str(), 1, &fd), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_NOT_FOUND);
  EXPECT_EQ(VLIBCFileLockByFile(dir_.path().c_str(), 1, &fd), -1);
  EXPECT_EQ(VLIBCFileUnlockByFile(-1), 0);
  EXPECT_EQ(VLIBCFileUnlockByFile(1000), 0);
}

}  // namespace
