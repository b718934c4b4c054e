// The cross-process semaphore: created by Enter, gone after Release, excludes other processes.
#include "vornwireless/semaphore/semaphore.h"

#include <gtest/gtest.h>
#include <poll.h>
#include <sys/ipc.h>
#include <sys/sem.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>

#include "support/syslog_capture.h"
#include "support/test_util.h"

using vornwireless::semaphore::Semaphore;

namespace {

std::string KeyHex(unsigned key) {
  char buf[16];
  snprintf(buf, sizeof buf, "0x%08x", key);
  return buf;
}

// Whether `ipcs -s` lists a semaphore array of that key.
bool IpcsListsKey(unsigned key) {
  auto r = vorntest::Run({"/usr/bin/ipcs", "-s"});
  return r.out.find(KeyHex(key)) != std::string::npos;
}

int SemValue(unsigned key) {
  int id = semget(static_cast<key_t>(key), 1, 0666);
  return id < 0 ? -1 : semctl(id, 0, GETVAL);
}

}  // namespace

class SemaphoreTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox()) << "needs the sandbox (private IPC namespace)";
  }
};

TEST_F(SemaphoreTest, EnterCreatesAndTakesReleaseRemoves) {
  const unsigned key = 0x5a0003;
  ASSERT_FALSE(IpcsListsKey(key));
  Semaphore sem(key);
  ASSERT_EQ(0, sem.Enter());
  EXPECT_TRUE(IpcsListsKey(key));
  EXPECT_EQ(0, SemValue(key));  // created with 1, taken by us
  ASSERT_EQ(0, sem.Release());
  EXPECT_FALSE(IpcsListsKey(key));
  EXPECT_EQ(-1, SemValue(key));
}

TEST_F(SemaphoreTest, TwoProcessesExcludeEachOther) {
  const unsigned key = 0x5a0004;
  Semaphore sem(key);
  ASSERT_EQ(0, sem.Enter());

  // Two other processes wait for it; each reports 'E' (entered) or 'F' (Enter failed).
  int fds[2], hold[2];
  ASSERT_EQ(0, pipe(fds));
  ASSERT_EQ(0, pipe(hold));  // a waiter that got in keeps it until we close this
  pid_t pids[2];
  for (pid_t& pid : pids) {
    pid = fork();
    ASSERT_GE(pid, 0);
    if (pid == 0) {
      close(fds[0]);
      close(hold[1]);
      Semaphore mine(key);
      char c = mine.Enter() == 0 ? 'E' : 'F';
      (void)!write(fds[1], &c, 1);
      char dummy;
      (void)!read(hold[0], &dummy, 1);
      _exit(0);
    }
  }
  close(fds[1]);
  close(hold[0]);
  struct pollfd p = {fds[0], POLLIN, 0};
  // While we hold it, neither can enter.
  EXPECT_EQ(0, poll(&p, 1, 500));

  vorntest::SyslogCapture log;
  ASSERT_EQ(0, sem.Release());
  // Our release hands it to one waiter; the removal that follows makes the other's semop fail,
  // which its Enter reports as an error.
  std::string got;
  while (got.size() < 2 && poll(&p, 1, 5000) == 1) {
    char c = 0;
    if (read(fds[0], &c, 1) != 1) break;
    got += c;
  }
  close(hold[1]);
  for (pid_t pid : pids) waitpid(pid, nullptr, 0);
  std::sort(got.begin(), got.end());
  EXPECT_EQ("EF", got);
  EXPECT_EQ(1u, log.Matching("^semaphore/semaphore.cpp:[0-9]+ semop fail semid [0-9]+ errno 43$").size())
      << log.Dump();
  EXPECT_FALSE(IpcsListsKey(key));
  close(fds[0]);
}

TEST_F(SemaphoreTest, TakenInTurnsByTwoProcesses) {
  const unsigned key = 0x5a0005;
  pid_t pid = fork();
  if (pid == 0) {
    Semaphore s(key);
    _exit(s.Enter() == 0 && s.Release() == 0 ? 0 : 1);
  }
  int status = 0;
  waitpid(pid, &status, 0);
  ASSERT_EQ(0, WEXITSTATUS(status));
  Semaphore sem(key);
  EXPECT_EQ(0, sem.Enter());
  EXPECT_EQ(0, sem.Release());
  EXPECT_FALSE(IpcsListsKey(key));
}

TEST_F(SemaphoreTest, AHolderThatDiesIsUndone) {
  const unsigned key = 0x5a0006;
  pid_t pid = fork();
  if (pid == 0) {
    Semaphore s(key);
    _exit(s.Enter() == 0 ? 0 : 1);  // exits holding it
  }
  int status = 0;
  waitpid(pid, &status, 0);
  ASSERT_EQ(0, WEXITSTATUS(status));
  EXPECT_EQ(1, SemValue(key));
  Semaphore sem(key);
  EXPECT_EQ(0, sem.Enter());
  EXPECT_EQ(0, sem.Release());
}

TEST_F(SemaphoreTest, EnterGivesUpWhenTheHolderKeepsItPastTheWaitLimit) {
  const unsigned key = 0x5a0007;
  Semaphore holder(key);
  ASSERT_EQ(0, holder.Enter());
  vorntest::SyslogCapture log;
  Semaphore waiter(key, 300);
  EXPECT_EQ(-1, waiter.Enter());
  EXPECT_EQ(1u, log.Matching("^semaphore/semaphore.cpp:[0-9]+ semop fail semid [0-9]+ errno " +
                             std::to_string(EAGAIN) + "$")
                    .size())
      << log.Dump();
  EXPECT_EQ(0, SemValue(key));  // still held, untouched by the waiter that gave up
  ASSERT_EQ(0, holder.Release());
  EXPECT_FALSE(IpcsListsKey(key));
}
