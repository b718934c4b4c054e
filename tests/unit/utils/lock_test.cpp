// FileLock between processes: blocking, hand-over, giving up after 30 tries, parent directories.
#include "vornwireless/utils/lock.h"

#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <cstdlib>
#include <thread>

#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "vornplatform/lock.h"

using vornwireless::utils::FileLock;
using vorntest::LogLine;
using vorntest::SyslogCapture;
using vorntest::TempDir;

namespace {

std::string LockTool() { return vorntest::BinaryDir() + "/tests/unit/utils/vorn-test-lock-tool"; }

}  // namespace

TEST(FileLock, LockCreatesParentDirectoryAndUnlockRemovesTheFile) {
  TempDir dir;
  const std::string path = dir / "deep/er/lock_rt_tables";
  FileLock lock(path, true);
  ASSERT_TRUE(lock.Lock());
  EXPECT_TRUE(vorntest::Exists(path));
  ASSERT_TRUE(lock.Unlock());
  EXPECT_FALSE(vorntest::Exists(path));
  EXPECT_TRUE(vorntest::Exists(dir / "deep/er"));
}

TEST(FileLock, PathWithoutSlashNeedsNoParent) {
  TempDir dir;
  ASSERT_EQ(0, chdir(dir.path().c_str()));
  FileLock lock("local.lock", true);
  EXPECT_TRUE(lock.Lock());
  EXPECT_TRUE(lock.Unlock());
  ASSERT_EQ(0, chdir("/"));
}

TEST(FileLock, ParentThatCannotBeMadeFails) {
  TempDir dir;
  ASSERT_TRUE(vorntest::WriteFile(dir / "file", "x"));
  const std::string path = dir / "file/sub/x.lock";
  SyslogCapture log;
  FileLock lock(path, true);
  EXPECT_FALSE(lock.Lock());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/lock.cpp", "Failed to create parent dir of [" + path + "]")))
      << log.Dump();
}

TEST(FileLock, UnlockWithoutLockFails) {
  TempDir dir;
  const std::string path = dir / "never.lock";
  SyslogCapture log;
  FileLock lock(path, true);
  EXPECT_FALSE(lock.Unlock());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/lock.cpp", "Failed to release file lock of [" + path + "]")))
      << log.Dump();
}

TEST(FileLock, SecondProcessWaitsForTheHolderAndGetsTheLockAfterRelease) {
  TempDir dir;
  const std::string path = dir / "shared.lock";
  FileLock mine(path, true);
  ASSERT_TRUE(mine.Lock());

  auto started = std::chrono::steady_clock::now();
  std::thread releaser([&] {
    std::this_thread::sleep_for(std::chrono::milliseconds(2500));
    EXPECT_TRUE(mine.Unlock());
  });
  auto r = vorntest::Run({LockTool(), "lock", path, "0"});
  auto waited = std::chrono::steady_clock::now() - started;
  releaser.join();
  EXPECT_EQ(0, r.status) << r.out << r.err;
  EXPECT_EQ(0u, r.out.rfind("locked ", 0)) << r.out;
  // It could not have the lock before the holder let go.
  EXPECT_GE(waited, std::chrono::milliseconds(2500));
}

TEST(FileLock, SharedLocksCoexist) {
  TempDir dir;
  const std::string path = dir / "s.lock";
  int fd = -1;
  ASSERT_EQ(1, VLIBCFileLockByFile(path.c_str(), 0, &fd));
  FileLock other(path, false);
  auto start = std::chrono::steady_clock::now();
  EXPECT_TRUE(other.Lock());
  EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::milliseconds(900));
  EXPECT_EQ(1, VLIBCFileUnlockByFile(fd));
  EXPECT_TRUE(other.Unlock());
}

// A holder that never lets go: the other process tries 30 times, a second apart, then gives up.
// Under the time seam those 29 seconds pass in about a second and a half of wall time.
TEST(FileLock, GivesUpAfterThirtyTriesUnderTheTimeSeam) {
  TempDir dir;
  const std::string path = dir / "held.lock";
  int fd = -1;
  ASSERT_EQ(1, VLIBCFileLockByFile(path.c_str(), 1, &fd));

  SyslogCapture log;
  auto started = std::chrono::steady_clock::now();
  auto r = vorntest::Run({vorntest::SourceDir() + "/tests/sandbox/vorn-timewarp", "20", "--",
                          LockTool(), "lock", path});
  auto wall = std::chrono::duration_cast<std::chrono::milliseconds>(
                  std::chrono::steady_clock::now() - started).count();
  EXPECT_EQ(1, r.status) << r.out << r.err;
  ASSERT_EQ(0u, r.out.rfind("failed ", 0)) << r.out << r.err;
  long fakeSeconds = std::atol(r.out.c_str() + 7);
  // 30 tries with a one-second sleep between each.
  EXPECT_GE(fakeSeconds, 28);
  EXPECT_LE(fakeSeconds, 31);
  RecordProperty("wall_ms", static_cast<int>(wall));
  std::printf("30 tries: %ld s of faked time in %lld ms of wall time\n", fakeSeconds,
              static_cast<long long>(wall));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/lock.cpp", "Failed to get file lock of [" + path + "]")))
      << log.Dump();
  EXPECT_EQ(1, VLIBCFileUnlockByFile(fd));
}
