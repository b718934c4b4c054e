// FileLock between processes: blocking, hand-over, giving up after 30 tries, parent directories.
#include "vornwireless/utils/lock.h"

#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/inotify.h>
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

// Counts the IN_OPEN events queued on an inotify descriptor (non-blocking: what is there now).
int CountOpens(int watch) {
  int opens = 0;
  alignas(struct inotify_event) char buf[4096];
  for (;;) {
    const ssize_t n = read(watch, buf, sizeof(buf));
    if (n <= 0) break;
    for (ssize_t at = 0; at < n;) {
      const auto* ev = reinterpret_cast<const struct inotify_event*>(buf + at);
      if ((ev->mask & IN_OPEN) != 0) ++opens;
      at += static_cast<ssize_t>(sizeof(struct inotify_event) + ev->len);
    }
  }
  return opens;
}

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
  // The first shared holder keeps its lock throughout: the second one can only succeed by
  // sharing it (an exclusive holder would make it give up after its tries).
  EXPECT_TRUE(other.Lock());
  // Both hold it at once: an exclusive lock is refused now.
  int probe = -1;
  EXPECT_EQ(0, VLIBCFileLockByFile(path.c_str(), 1, &probe));
  EXPECT_EQ(1, VLIBCFileUnlockByFile(fd));
  EXPECT_TRUE(other.Unlock());
}

// A holder that never lets go: the other process tries 30 times, a second apart, then gives up.
// Under the time seam those 29 seconds pass in about a second and a half of wall time. The tries
// are counted as opens of the lock file (each try opens it once); the faked clock shows the
// sleeps between them (at least 29 faked seconds; the faked clock only runs fast, so an upper
// bound on it would be a wall-clock bound in disguise).
TEST(FileLock, GivesUpAfterThirtyTriesUnderTheTimeSeam) {
  TempDir dir;
  const std::string path = dir / "held.lock";
  int fd = -1;
  ASSERT_EQ(1, VLIBCFileLockByFile(path.c_str(), 1, &fd));

  const int watch = inotify_init1(IN_NONBLOCK | IN_CLOEXEC);
  ASSERT_GE(watch, 0);
  // Closes are watched too: the kernel merges an event into an identical one still unread.
  ASSERT_GE(inotify_add_watch(watch, path.c_str(), IN_OPEN | IN_CLOSE), 0);

  SyslogCapture log;
  auto started = std::chrono::steady_clock::now();
  auto r = vorntest::Run({vorntest::SourceDir() + "/tests/sandbox/vorn-timewarp", "20", "--",
                          LockTool(), "lock", path});
  const int tries = CountOpens(watch);
  close(watch);
  auto wall = std::chrono::duration_cast<std::chrono::milliseconds>(
                  std::chrono::steady_clock::now() - started).count();
  EXPECT_EQ(1, r.status) << r.out << r.err;
  ASSERT_EQ(0u, r.out.rfind("failed ", 0)) << r.out << r.err;
  long fakeSeconds = std::atol(r.out.c_str() + 7);
  EXPECT_EQ(30, tries);
  // 29 one-second sleeps between the tries.
  EXPECT_GE(fakeSeconds, 29);
  RecordProperty("wall_ms", static_cast<int>(wall));
  std::printf("30 tries: %ld s of faked time in %lld ms of wall time\n", fakeSeconds,
              static_cast<long long>(wall));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/lock.cpp", "Failed to get file lock of [" + path + "]")))
      << log.Dump();
  EXPECT_EQ(1, VLIBCFileUnlockByFile(fd));
}
