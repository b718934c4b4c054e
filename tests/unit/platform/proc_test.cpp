#include "vornplatform/proc.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/time.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <cstring>
#include <string>
#include <thread>
#include <vector>

#include "support/test_util.h"
#include "vornplatform/err.h"

namespace {

using vorntest::Exists;
using vorntest::ReadFile;
using vorntest::TempDir;
using vorntest::WriteFile;

constexpr const char* kSh = "/bin/sh";

// The state letter of /proc/PID/stat, or 0 when the process is gone.
char ProcState(pid_t pid) {
  const std::string stat = ReadFile("/proc/" + std::to_string(pid) + "/stat");
  const std::size_t paren = stat.rfind(')');
  if (paren == std::string::npos || paren + 2 >= stat.size()) return 0;
  return stat[paren + 2];
}

bool WaitForState(pid_t pid, char state) {
  for (int i = 0; i < 400; ++i) {
    if (ProcState(pid) == state) return true;
    usleep(5000);
  }
  return false;
}

bool WaitForFile(const std::string& path) {
  for (int i = 0; i < 2000; ++i) {
    if (!ReadFile(path).empty()) return true;
    usleep(5000);
  }
  return false;
}

// A child that sleeps until it is killed.
pid_t StartSleeper() {
  pid_t pid = fork();
  if (pid == 0) {
    execl("/bin/sleep", "sleep", "30", static_cast<char*>(nullptr));
    _exit(127);
  }
  return pid;
}

int Reap(pid_t pid) {
  int status = 0;
  while (waitpid(pid, &status, 0) < 0 && errno == EINTR) {
  }
  return status;
}

class ProcTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_FALSE(dir_.path().empty());
    VLIBCErrClear();
  }
  std::string P(const std::string& name) const { return dir_ / name; }
  TempDir dir_;
};

// ---------------------------------------------------------------------------------------------
// Exec

TEST_F(ProcTest, ExecReturnsTheRealExitStatus) {
  EXPECT_EQ(VLIBCExec("/bin/true", nullptr, nullptr, nullptr, nullptr), 0);
  EXPECT_EQ(VLIBCExec("/bin/false", nullptr, nullptr, nullptr, nullptr), 1);
  EXPECT_EQ(VLIBCExec(kSh, "-c", "exit 3", nullptr, nullptr), 3);
  EXPECT_EQ(VLIBCExec(kSh, "-c", "exit 127", nullptr, nullptr), 127);
  EXPECT_EQ(VLIBCExec(kSh, "-c", "exit 255", nullptr, nullptr), 255);
  EXPECT_EQ(vornnetsdk::sdk_s::VLIBCExec_S(kSh, "-c", "exit 4", nullptr, nullptr), 4);
}

TEST_F(ProcTest, ExecPassesArgumentsVerbatimWithoutAShell) {
  const std::string out = P("out");
  const std::string script = "printf '%s|' \"$0\" \"$1\" > " + out;
  EXPECT_EQ(VLIBCExec(kSh, "-c", script.c_str(), "a b;echo no", "$HOME *"), 0);
  EXPECT_EQ(ReadFile(out), "a b;echo no|$HOME *|");
  // The first NULL ends the arguments.
  EXPECT_EQ(VLIBCExec(kSh, "-c", "exit $#", nullptr, "ignored"), 0);
  EXPECT_EQ(VLIBCExec(kSh, "-c", "exit $#", "zero", "one"), 1);
}

TEST_F(ProcTest, ExecOfMissingOrBadProgramIsMinusOne) {
  EXPECT_EQ(VLIBCExec(P("missing").c_str(), nullptr, nullptr, nullptr, nullptr), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_NOT_FOUND);
  WriteFile(P("noexec"), "#!/bin/sh\nexit 0\n", 0644);
  VLIBCErrClear();
  EXPECT_EQ(VLIBCExec(P("noexec").c_str(), nullptr, nullptr, nullptr, nullptr), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_EXEC);
  EXPECT_EQ(VLIBCExec(dir_.path().c_str(), nullptr, nullptr, nullptr, nullptr), -1);
  EXPECT_EQ(VLIBCExec(nullptr, nullptr, nullptr, nullptr, nullptr), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_BAD_PARAMETER);
  EXPECT_EQ(VLIBCExec("", nullptr, nullptr, nullptr, nullptr), -1);
}

TEST_F(ProcTest, ExecKilledBySignalIsMinusOne) {
  EXPECT_EQ(VLIBCExec(kSh, "-c", "kill -TERM $$", nullptr, nullptr), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_EXEC);
  EXPECT_EQ(VLIBCExec(kSh, "-c", "kill -KILL $$", nullptr, nullptr), -1);
}

void OnAlarm(int) {}

TEST_F(ProcTest, ExecWaitSurvivesInterruptingSignals) {
  struct sigaction sa;
  std::memset(&sa, 0, sizeof sa);
  sa.sa_handler = OnAlarm;  // no SA_RESTART: waitpid sees EINTR
  struct sigaction old;
  sigaction(SIGALRM, &sa, &old);
  struct itimerval tv = {{0, 5000}, {0, 5000}};
  setitimer(ITIMER_REAL, &tv, nullptr);
  const int rc = VLIBCExec(kSh, "-c", "sleep 0.3; exit 6", nullptr, nullptr);
  struct itimerval off = {{0, 0}, {0, 0}};
  setitimer(ITIMER_REAL, &off, nullptr);
  sigaction(SIGALRM, &old, nullptr);
  EXPECT_EQ(rc, 6);
}

TEST_F(ProcTest, ExecChildGetsDefaultSignals) {
  struct sigaction ign;
  std::memset(&ign, 0, sizeof ign);
  ign.sa_handler = SIG_IGN;
  struct sigaction old;
  sigaction(SIGUSR1, &ign, &old);
  const std::string out = P("ign");
  const std::string script = "grep SigIgn /proc/$$/status > " + out;
  EXPECT_EQ(VLIBCExec(kSh, "-c", script.c_str(), nullptr, nullptr), 0);
  sigaction(SIGUSR1, &old, nullptr);
  const std::string text = ReadFile(out);
  ASSERT_FALSE(text.empty());
  // SIGUSR1 is bit 9 (value 0x200) of the mask.
  const unsigned long long mask = std::stoull(text.substr(text.find(':') + 1), nullptr, 16);
  EXPECT_EQ(mask & 0x200ULL, 0ULL) << text;
}

TEST_F(ProcTest, ExeclTakesANullEndedList) {
  EXPECT_EQ(VLIBCExecl(kSh, 187, "-c", "exit 0", static_cast<char*>(nullptr)), 0);
  EXPECT_EQ(VLIBCExecl(kSh, 0xbb, "-c", "exit $#", "a", "b", "c", "d", "e", "f",
                       static_cast<char*>(nullptr)),
            5);  // "a" is $0
  EXPECT_EQ(VLIBCExecl("/bin/true", 187, static_cast<char*>(nullptr)), 0);
  EXPECT_EQ(VLIBCExecl(P("missing").c_str(), 187, "x", static_cast<char*>(nullptr)), -1);
  EXPECT_EQ(VLIBCExecl(nullptr, 187, static_cast<char*>(nullptr)), -1);
}

TEST_F(ProcTest, ExecvPassesArgvZeroAsGiven) {
  const std::string out = P("cmdline");
  const std::string script = "cat /proc/$$/cmdline > " + out;
  std::vector<std::string> args{"restart-topology", "-c", script};
  std::vector<char*> argv;
  for (auto& a : args) argv.push_back(&a[0]);
  argv.push_back(nullptr);
  EXPECT_EQ(VLIBCExecv(kSh, argv.data(), 1), 0);
  EXPECT_EQ(ReadFile(out),
            std::string("restart-topology\0-c\0", 20) + script + std::string(1, '\0'));
  EXPECT_EQ(VLIBCExecv("/bin/true", nullptr, 1), 0);
  EXPECT_EQ(VLIBCExecv("/bin/false", nullptr, 1), 1);
  EXPECT_EQ(VLIBCExecv(P("missing").c_str(), argv.data(), 1), -1);
  EXPECT_EQ(VLIBCExecv(nullptr, argv.data(), 1), -1);
}

// ---------------------------------------------------------------------------------------------
// Popen / Pclose

TEST_F(ProcTest, PopenReadsStdout) {
  FILE* fp = VLIBCPopen("/bin/echo", "r", "hello", "a b", static_cast<char*>(nullptr));
  ASSERT_NE(fp, nullptr);
  char line[128] = {0};
  ASSERT_NE(std::fgets(line, sizeof line, fp), nullptr);
  EXPECT_STREQ(line, "hello a b\n");
  EXPECT_EQ(VLIBCPclose(fp), 0);
}

TEST_F(ProcTest, PopenWritesStdin) {
  const std::string out = P("written");
  const std::string script = "cat > " + out;
  FILE* fp = VLIBCPopen(kSh, "w", "-c", script.c_str(), static_cast<char*>(nullptr));
  ASSERT_NE(fp, nullptr);
  std::fputs("line one\nline two\n", fp);
  EXPECT_EQ(VLIBCPclose(fp), 0);
  EXPECT_EQ(ReadFile(out), "line one\nline two\n");
}

TEST_F(ProcTest, PcloseGivesTheExitStatus) {
  FILE* fp = VLIBCPopen(kSh, "r", "-c", "echo x; exit 5", static_cast<char*>(nullptr));
  ASSERT_NE(fp, nullptr);
  char line[16];
  EXPECT_NE(std::fgets(line, sizeof line, fp), nullptr);
  EXPECT_EQ(VLIBCPclose(fp), 5);
  fp = VLIBCPopen(kSh, "r", "-c", "kill -KILL $$", static_cast<char*>(nullptr));
  ASSERT_NE(fp, nullptr);
  EXPECT_EQ(VLIBCPclose(fp), -1);
}

TEST_F(ProcTest, PopenFailures) {
  EXPECT_EQ(VLIBCPopen(P("missing").c_str(), "r", static_cast<char*>(nullptr)), nullptr);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_NOT_FOUND);
  EXPECT_EQ(VLIBCPopen("/bin/echo", "x", static_cast<char*>(nullptr)), nullptr);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_BAD_PARAMETER);
  EXPECT_EQ(VLIBCPopen("/bin/echo", nullptr, static_cast<char*>(nullptr)), nullptr);
  EXPECT_EQ(VLIBCPopen(nullptr, "r", static_cast<char*>(nullptr)), nullptr);
  EXPECT_EQ(VLIBCPclose(nullptr), -1);
  FILE* other = std::fopen("/dev/null", "r");
  ASSERT_NE(other, nullptr);
  EXPECT_EQ(VLIBCPclose(other), -1);  // not ours: left open
  std::fclose(other);
}

// A second pipe must not keep the first one's write end open (its reader would never see EOF).
TEST_F(ProcTest, PopenStreamsDoNotLeakIntoOtherChildren) {
  FILE* first = VLIBCPopen("/bin/cat", "w", static_cast<char*>(nullptr));
  ASSERT_NE(first, nullptr);
  FILE* second = VLIBCPopen("/bin/cat", "w", static_cast<char*>(nullptr));
  ASSERT_NE(second, nullptr);
  // cat ends, and VLIBCPclose gives its status 0, only when it sees the end of its input; a
  // write end leaked into the second child would keep it running until its limit (then -1).
  EXPECT_EQ(VLIBCPclose(first), 0);
  EXPECT_EQ(VLIBCPclose(second), 0);
}

TEST_F(ProcTest, PopenIsThreadSafe) {
  std::atomic<int> bad{0};
  std::vector<std::thread> threads;
  for (int t = 0; t < 6; ++t) {
    threads.emplace_back([t, &bad] {
      for (int i = 0; i < 15; ++i) {
        const std::string word = std::to_string(t) + "-" + std::to_string(i);
        FILE* fp = VLIBCPopen("/bin/echo", "r", word.c_str(), static_cast<char*>(nullptr));
        if (fp == nullptr) {
          ++bad;
          continue;
        }
        char line[64] = {0};
        if (std::fgets(line, sizeof line, fp) == nullptr || word + "\n" != line) ++bad;
        if (VLIBCPclose(fp) != 0) ++bad;
      }
    });
  }
  for (auto& th : threads) th.join();
  EXPECT_EQ(bad.load(), 0);
}

// ---------------------------------------------------------------------------------------------
// Forks

TEST_F(ProcTest, ForkExPlain) {
  const pid_t pid = VLIBCProcForkEx(0);
  ASSERT_GE(pid, 0);
  if (pid == 0) _exit(4);
  const int status = Reap(pid);
  ASSERT_TRUE(WIFEXITED(status));
  EXPECT_EQ(WEXITSTATUS(status), 4);
}

TEST_F(ProcTest, ForkExDetachedLeavesNoChildOfOurs) {
  // Run by a child of ours: as PID 1 of the sandbox we would adopt every orphan ourselves, so
  // the caller whose children are looked at must be an ordinary process. Its exit status says
  // what it saw: 0 all well, 1 fork failed, 2 no report from the worker, 3 the worker names the
  // wrong pid, 4 the worker is still its child, 5 a child of it is left.
  const std::string out = P("worker");
  const pid_t runner = fork();
  ASSERT_GE(runner, 0);
  if (runner == 0) {
    const pid_t pid = VLIBCProcForkEx(VLIBC_FORK_DETACH);
    if (pid < 0) _exit(1);
    if (pid == 0) {
      const std::string text = std::to_string(getpid()) + " " + std::to_string(getppid());
      vorntest::WriteFile(out + ".tmp", text);
      rename((out + ".tmp").c_str(), out.c_str());
      _exit(0);
    }
    if (!WaitForFile(out)) _exit(2);
    const std::string text = ReadFile(out);
    if (text.substr(0, text.find(' ')) != std::to_string(pid)) _exit(3);
    if (text.substr(text.find(' ') + 1) == std::to_string(getpid())) _exit(4);
    int status = 0;
    errno = 0;
    if (waitpid(-1, &status, WNOHANG) != -1 || errno != ECHILD) _exit(5);
    _exit(0);
  }
  const int status = Reap(runner);
  ASSERT_TRUE(WIFEXITED(status));
  EXPECT_EQ(WEXITSTATUS(status), 0);
  while (waitpid(-1, nullptr, WNOHANG) > 0) {
  }
}

TEST_F(ProcTest, ForkChildNoWaitLeavesAZombieThatCountsAsDead) {
  const pid_t pid = VLIBCProcForkChildNoWait();
  ASSERT_GE(pid, 0);
  if (pid == 0) _exit(0);
  ASSERT_TRUE(WaitForState(pid, 'Z'));
  EXPECT_EQ(kill(pid, 0), 0) << "a zombie still answers kill()";
  EXPECT_EQ(VLIBCProcAlive(pid), 0);
  Reap(pid);
  EXPECT_EQ(VLIBCProcAlive(pid), 0);
}

// Children forked (without exec) by another thread must not hold the pipes of a running
// VLIBCExec open: the exec would otherwise wait for them to end.
TEST_F(ProcTest, ExecIsNotHeldUpByChildrenForkedMeanwhile) {
  std::atomic<bool> done{false};
  std::vector<pid_t> children;
  std::thread forker([&] {
    while (!done && children.size() < 40) {
      const pid_t pid = VLIBCProcForkEx(0);
      if (pid == 0) {
        sleep(60);  // a child that kept an exec's pipe would hold that exec for a minute
        _exit(0);
      }
      if (pid > 0) children.push_back(pid);
      usleep(2000);
    }
  });
  int failures = 0;
  for (int i = 0; i < 40; ++i) {
    if (VLIBCExec("/bin/true", nullptr, nullptr, nullptr, nullptr) != 0) ++failures;
  }
  done = true;
  forker.join();
  // An exec held up by a child returns only once that child has ended (after its minute): every
  // child still running now shows that no exec waited for one (event order, not a time bound).
  size_t running = 0;
  for (pid_t pid : children) {
    if (waitpid(pid, nullptr, WNOHANG) == 0) ++running;
  }
  EXPECT_FALSE(children.empty());
  EXPECT_EQ(running, children.size());
  for (pid_t pid : children) {
    kill(pid, SIGKILL);
    Reap(pid);
  }
  EXPECT_EQ(failures, 0);
}

// ---------------------------------------------------------------------------------------------
// Pid files, liveness, signals

TEST_F(ProcTest, PidFileCreateAndRead) {
  const std::string p = P("x.pid");
  EXPECT_EQ(VLIBCProcPidFileCreate(p.c_str()), 0);
  EXPECT_EQ(ReadFile(p), std::to_string(getpid()) + "\n");
  EXPECT_EQ(VLIBCReadPidFile(p.c_str()), getpid());
  WriteFile(p, "stale 1\n");
  EXPECT_EQ(VLIBCProcPidFileCreate(p.c_str()), 0);
  EXPECT_EQ(ReadFile(p), std::to_string(getpid()) + "\n");
  EXPECT_EQ(VLIBCProcPidFileCreate(P("nodir/x.pid").c_str()), -1);
  EXPECT_EQ(VLIBCProcPidFileCreate(nullptr), -1);
  EXPECT_EQ(VLIBCProcPidFileCreate(""), -1);
  mkdir(P("busy").c_str(), 0755);
  WriteFile(P("busy/f"), "x");
  EXPECT_EQ(VLIBCProcPidFileCreate(P("busy").c_str()), -1);
  // Failed rewrites leave no temporary file.
  EXPECT_EQ(vorntest::Run({"/bin/ls", "-A", dir_.path()}).out, "busy\nx.pid\n");
  EXPECT_TRUE(Exists(P("busy/f")));
}

TEST_F(ProcTest, ReadPidFileParsesStrictly) {
  const std::string p = P("pid");
  struct Case {
    const char* text;
    pid_t want;
  } cases[] = {{"123\n", 123}, {"  42  \n", 42},     {"77", 77},      {"7\r\n", 7},
               {"", 0},        {"abc\n", 0},         {"123abc\n", 0}, {"0\n", 0},
               {"-5\n", 0},    {"99999999999\n", 0}, {"\n\n", 0}};
  for (const auto& c : cases) {
    WriteFile(p, c.text);
    EXPECT_EQ(VLIBCReadPidFile(p.c_str()), c.want) << '"' << c.text << '"';
  }
  EXPECT_EQ(VLIBCReadPidFile(P("missing").c_str()), 0);
  EXPECT_EQ(VLIBCReadPidFile(dir_.path().c_str()), 0);
  EXPECT_EQ(VLIBCReadPidFile(nullptr), -1);
  EXPECT_EQ(VLIBCReadPidFile(""), -1);
}

TEST_F(ProcTest, ProcAlive) {
  EXPECT_EQ(VLIBCProcAlive(getpid()), 1);
  EXPECT_EQ(VLIBCProcAlive(0), 0);
  EXPECT_EQ(VLIBCProcAlive(-1), 0);
  const pid_t child = StartSleeper();
  ASSERT_GT(child, 0);
  EXPECT_EQ(VLIBCProcAlive(child), 1);
  kill(child, SIGKILL);
  ASSERT_TRUE(WaitForState(child, 'Z'));
  EXPECT_EQ(VLIBCProcAlive(child), 0);
  Reap(child);
  EXPECT_EQ(VLIBCProcAlive(child), 0);
}

TEST_F(ProcTest, ProcAliveByPidFile) {
  const std::string p = P("d.pid");
  WriteFile(p, std::to_string(getpid()) + "\n");
  EXPECT_EQ(VLIBCProcAliveByPidFile(p.c_str()), 1);
  const pid_t child = StartSleeper();
  WriteFile(p, std::to_string(child) + "\n");
  EXPECT_EQ(VLIBCProcAliveByPidFile(p.c_str()), 1);
  kill(child, SIGKILL);
  ASSERT_TRUE(WaitForState(child, 'Z'));
  EXPECT_EQ(VLIBCProcAliveByPidFile(p.c_str()), 0);
  Reap(child);
  EXPECT_EQ(VLIBCProcAliveByPidFile(p.c_str()), 0);
  WriteFile(p, "garbage\n");
  EXPECT_EQ(VLIBCProcAliveByPidFile(p.c_str()), 0);
  EXPECT_EQ(VLIBCProcAliveByPidFile(P("missing").c_str()), 0);
  EXPECT_EQ(VLIBCProcAliveByPidFile(nullptr), 0);
}

TEST_F(ProcTest, SignalByPidFile) {
  const std::string p = P("wvdial.pid");
  const pid_t child = StartSleeper();
  ASSERT_GT(child, 0);
  WriteFile(p, std::to_string(child) + "\n");
  EXPECT_EQ(VLIBCProcSignalByPidFile(p.c_str(), 0, 0, 0), 0);
  EXPECT_EQ(VLIBCProcSignalByPidFile(p.c_str(), SIGTERM, 0, 0), 0);
  const int status = Reap(child);
  ASSERT_TRUE(WIFSIGNALED(status));
  EXPECT_EQ(WTERMSIG(status), SIGTERM);
  EXPECT_EQ(VLIBCProcSignalByPidFile(p.c_str(), SIGTERM, 0, 0), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_NOT_FOUND);
  EXPECT_EQ(VLIBCProcSignalByPidFile(P("missing").c_str(), SIGTERM, 0, 0), -1);
  WriteFile(p, "0\n");
  EXPECT_EQ(VLIBCProcSignalByPidFile(p.c_str(), SIGTERM, 0, 0), -1);
  EXPECT_EQ(VLIBCProcSignalByPidFile(nullptr, SIGTERM, 0, 0), -1);
  EXPECT_EQ(VLIBCProcSignalByPidFile(p.c_str(), -1, 0, 0), -1);
}

// ---------------------------------------------------------------------------------------------
// Ps, Kill

TEST_F(ProcTest, PsCountsCommandLinesHoldingThePattern) {
  const std::string marker = "vorn-ps-marker-" + std::to_string(getpid());
  std::vector<pid_t> pids;
  for (int i = 0; i < 2; ++i) {
    pid_t pid = fork();
    ASSERT_GE(pid, 0);
    if (pid == 0) {
      // The marker is argv[0] of a program that forks nothing, so exactly these two match.
      execl("/bin/sleep", marker.c_str(), "30", static_cast<char*>(nullptr));
      _exit(127);
    }
    pids.push_back(pid);
  }
  // Wait until both have exec'd (their command line shows the marker).
  for (int i = 0; i < 400 && VLIBCPs(marker.c_str(), 0, 0) < 2; ++i) usleep(5000);
  EXPECT_EQ(VLIBCPs(marker.c_str(), 0, 0), 2);
  // NULs between the arguments read as blanks.
  EXPECT_EQ(VLIBCPs((marker + " 30").c_str(), 0, 0), 2);
  EXPECT_EQ(VLIBCPs((marker + "-nobody").c_str(), 0, 0), 0);
  for (pid_t pid : pids) {
    kill(pid, SIGKILL);
    Reap(pid);
  }
  EXPECT_EQ(VLIBCPs(marker.c_str(), 0, 0), 0);
  EXPECT_EQ(VLIBCPs(nullptr, 0, 0), -1);
  EXPECT_EQ(VLIBCPs("", 0, 0), -1);
}

TEST_F(ProcTest, KillTermsEveryProcessOfThatName) {
  // A copy of sleep with a name of our own, so nothing else is hit.
  const std::string name = "vk" + std::to_string(getpid() % 100000);
  const std::string prog = P(name);
  const std::string sleepBin = ReadFile("/bin/sleep");
  ASSERT_FALSE(sleepBin.empty());
  ASSERT_TRUE(WriteFile(prog, sleepBin, 0755));
  std::vector<pid_t> pids;
  for (int i = 0; i < 2; ++i) {
    pid_t pid = fork();
    ASSERT_GE(pid, 0);
    if (pid == 0) {
      execl(prog.c_str(), name.c_str(), "30", static_cast<char*>(nullptr));
      _exit(127);
    }
    pids.push_back(pid);
  }
  for (pid_t pid : pids) {
    for (int i = 0; i < 400; ++i) {
      std::string comm = ReadFile("/proc/" + std::to_string(pid) + "/comm");
      if (comm == name + "\n") break;
      usleep(5000);
    }
  }
  EXPECT_EQ(VLIBCKill(name.c_str()), 0);
  for (pid_t pid : pids) {
    const int status = Reap(pid);
    ASSERT_TRUE(WIFSIGNALED(status));
    EXPECT_EQ(WTERMSIG(status), SIGTERM);
  }
  EXPECT_EQ(VLIBCKill(name.c_str()), 0);  // none left: still fine
  EXPECT_EQ(VLIBCKill(nullptr), -1);
  EXPECT_EQ(VLIBCKill(""), -1);
}

}  // namespace
