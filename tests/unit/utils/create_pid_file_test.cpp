// Pid files: one instance at a time, the second refused without a log line.
#include "vornwireless/utils/create_pid_file.h"

#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include "support/syslog_capture.h"
#include "support/test_util.h"

using vornwireless::utils::CreatePidFile;
using vorntest::LogLine;
using vorntest::SyslogCapture;
using vorntest::TempDir;

namespace {
// CreatePidFile's result in a forked child (fcntl locks belong to processes).
int CreateInChild(const std::string& path) {
  pid_t pid = fork();
  if (pid == 0) _exit(CreatePidFile(path) < 0 ? 1 : 0);
  int status = 0;
  waitpid(pid, &status, 0);
  return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}
}  // namespace

TEST(CreatePidFile, WritesThePidAndKeepsTheDescriptor) {
  TempDir dir;
  const std::string path = dir / "d.pid";
  ASSERT_TRUE(vorntest::WriteFile(path, "999999 stale and longer than a pid\n"));
  int fd = CreatePidFile(path);
  ASSERT_GE(fd, 0);
  EXPECT_EQ(std::to_string(getpid()) + "\n", vorntest::ReadFile(path));
  close(fd);
}

TEST(CreatePidFile, NewFileIsMode0600) {
  TempDir dir;
  int fd = CreatePidFile(dir / "new.pid");
  ASSERT_GE(fd, 0);
  EXPECT_EQ(0600, vorntest::FileMode(dir / "new.pid"));
  close(fd);
}

TEST(CreatePidFile, SecondInstanceGetsMinusOneAndNoLogLine) {
  TempDir dir;
  const std::string path = dir / "once.pid";
  int fd = CreatePidFile(path);
  ASSERT_GE(fd, 0);
  SyslogCapture log;
  EXPECT_EQ(1, CreateInChild(path));
  EXPECT_TRUE(log.Lines().empty()) << log.Dump();
  EXPECT_EQ(std::to_string(getpid()) + "\n", vorntest::ReadFile(path));
  close(fd);
  // With the first instance gone the next one starts.
  EXPECT_EQ(0, CreateInChild(path));
}

TEST(CreatePidFile, UnopenablePathIsLogged) {
  TempDir dir;
  const std::string path = dir / "no/such/dir.pid";
  SyslogCapture log;
  EXPECT_EQ(-1, CreatePidFile(path));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/create_pid_file.cpp", "Could not open PID file [" + path + "]")))
      << log.Dump();
}

TEST(CreatePidFile, FileThatCannotBeTruncatedIsLogged) {
  SyslogCapture log;
  EXPECT_EQ(-1, CreatePidFile("/dev/full"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/create_pid_file.cpp", "Could not truncate PID file [/dev/full]")))
      << log.Dump();
}
