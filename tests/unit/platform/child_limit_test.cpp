// Programs that never end: exec, popen, hooks and platform actions give up after their limit, kill
// the program with its whole process group, log it, and report the failure to the caller.
#include "vornplatform/child_limit.h"

#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <dirent.h>
#include <iostream>
#include <string>
#include <vector>

#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "vornplatform/action.h"
#include "vornplatform/err.h"
#include "vornplatform/hook.h"
#include "vornplatform/proc.h"

namespace {

// Small enough for a quick test, large enough for /bin/sh to start its grandchild and write the
// pids on a loaded machine before the limit passes.
constexpr long kLimitMs = 1500;
const std::string kPidDir = "/run/child-limit-test";

// A script that records its pid and the pid of a grandchild, then waits for ever.
std::string HangingScript() {
  return "#!/bin/sh\n"
         "sleep 100000 &\n"
         "echo $! > " + kPidDir + "/grandchild.tmp && mv " + kPidDir + "/grandchild.tmp " +
         kPidDir + "/grandchild\n"
         "echo $$ > " + kPidDir + "/leader.tmp && mv " + kPidDir + "/leader.tmp " + kPidDir +
         "/leader\n"
         "exec sleep 100000\n";
}

pid_t ReadPid(const std::string& name) {
  return static_cast<pid_t>(std::atoi(vorntest::ReadFile(kPidDir + "/" + name).c_str()));
}

// The process state letter of pid from /proc ('\0' when it is gone).
char ProcState(pid_t pid) {
  const std::string stat = vorntest::ReadFile("/proc/" + std::to_string(pid) + "/stat");
  const std::size_t paren = stat.rfind(')');
  return paren == std::string::npos || paren + 2 >= stat.size() ? '\0' : stat[paren + 2];
}

// Living (not zombie) processes whose process group is pgid.
std::vector<pid_t> LivingGroupMembers(pid_t pgid) {
  std::vector<pid_t> found;
  DIR* d = opendir("/proc");
  if (d == nullptr) return found;
  while (struct dirent* e = readdir(d)) {
    const pid_t pid = static_cast<pid_t>(std::atoi(e->d_name));
    if (pid <= 0) continue;
    const std::string stat = vorntest::ReadFile("/proc/" + std::to_string(pid) + "/stat");
    const std::size_t paren = stat.rfind(')');
    if (paren == std::string::npos) continue;
    char state = 0;
    int ppid = 0, pgrp = 0;
    if (std::sscanf(stat.c_str() + paren + 1, " %c %d %d", &state, &ppid, &pgrp) != 3) continue;
    if (pgrp == pgid && state != 'Z' && state != 'X') found.push_back(pid);
  }
  closedir(d);
  return found;
}

// Reaps the zombies that come back to us as PID 1 of the sandbox.
void ReapOrphans() {
  while (waitpid(-1, nullptr, WNOHANG) > 0) {
  }
}

class ChildLimitTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox()) << "installs hooks and actions under /usr/vorn";
    ASSERT_TRUE(vorntest::SyslogCapture::Available()) << "the sandbox's syslog catcher is missing";
    ASSERT_EQ(0, vorntest::Run({"/bin/rm", "-rf", kPidDir}).status);
    ASSERT_EQ(0, vorntest::Run({"/bin/mkdir", "-p", kPidDir}).status);
    VLIBCErrClear();
    start_ = std::chrono::steady_clock::now();
  }
  void TearDown() override {
    const pid_t leader = ReadPid("leader");
    if (leader > 0) kill(-leader, SIGKILL);  // whatever a failed test left behind
    ReapOrphans();
  }

  long ElapsedMs() const {
    return static_cast<long>(std::chrono::duration_cast<std::chrono::milliseconds>(
                                 std::chrono::steady_clock::now() - start_)
                                 .count());
  }

  // The program and its grandchild were started, and no process of its group lives on.
  void ExpectGroupGone(const char* what) {
    const pid_t leader = ReadPid("leader");
    const pid_t grandchild = ReadPid("grandchild");
    ASSERT_GT(leader, 0) << what << ": the program did not start";
    ASSERT_GT(grandchild, 0) << what << ": the grandchild did not start";
    // SIGKILL is delivered at once, but a process takes a moment to be torn down.
    for (int i = 0; i < 1000; ++i) {
      ReapOrphans();
      const char gs = ProcState(grandchild);
      if (LivingGroupMembers(leader).empty() && (gs == '\0' || gs == 'Z')) break;
      usleep(10000);
    }
    ReapOrphans();
    EXPECT_TRUE(LivingGroupMembers(leader).empty()) << what;
    const char g = ProcState(grandchild);
    EXPECT_TRUE(g == '\0' || g == 'Z') << what << ": grandchild state " << g;
    const char l = ProcState(leader);
    EXPECT_TRUE(l == '\0' || l == 'Z') << what << ": leader state " << l;
  }

  void ReportTiming(const char* what) {
    const long ms = ElapsedMs();
    // The limit is measured in whole milliseconds.
    EXPECT_GE(ms, kLimitMs - 2) << what << " gave up before its limit";
    std::cout << "[timing] " << what << ": returned after " << ms << " ms (limit " << kLimitMs
              << " ms)" << std::endl;
    RecordProperty("elapsed_ms", static_cast<int>(ms));
  }

  std::chrono::steady_clock::time_point start_;
};

std::string KilledLine(const std::string& path) {
  return "^[a-z/_]+\\.cpp:[0-9]+ " + path + " still running after its limit of " +
         std::to_string(kLimitMs) + " ms: killed with its process group$";
}

}  // namespace

TEST(ChildLimitDefaults, ScopedLimitsNestAndFallBackToTheCallSiteDefault) {
  EXPECT_EQ(vornplatform::ChildLimitMs(vornplatform::kHookLimitMs), 30000);
  EXPECT_EQ(vornplatform::ChildLimitMs(vornplatform::kActionLimitMs), 60000);
  EXPECT_EQ(vornplatform::ChildLimitMs(vornplatform::kExecLimitMs), 60000);
  {
    vornplatform::ScopedChildLimit outer(5000);
    EXPECT_EQ(vornplatform::ChildLimitMs(vornplatform::kHookLimitMs), 5000);
    {
      vornplatform::ScopedChildLimit inner(250);
      EXPECT_EQ(vornplatform::ChildLimitMs(vornplatform::kExecLimitMs), 250);
    }
    EXPECT_EQ(vornplatform::ChildLimitMs(vornplatform::kExecLimitMs), 5000);
  }
  EXPECT_EQ(vornplatform::ChildLimitMs(vornplatform::kExecLimitMs), 60000);
}

TEST_F(ChildLimitTest, HookThatNeverExitsIsKilledWithItsGroupAndTheNextOneStillRuns) {
  const std::string dir = "/usr/vorn/etc/hooks/net/hang_test";
  ASSERT_EQ(0, vorntest::Run({"/bin/mkdir", "-p", dir}).status);
  ASSERT_TRUE(vorntest::WriteFile(dir + "/10-hang", HangingScript(), 0755));
  ASSERT_TRUE(vorntest::WriteFile(dir + "/20-after",
                                  "#!/bin/sh\necho \"$1\" > " + kPidDir + "/after\n", 0755));
  vorntest::SyslogCapture log;
  vornnetsdk::hook::BaseHook hook("net", "net/hang_test");
  int rc;
  {
    vornplatform::ScopedChildLimit limit(kLimitMs);
    rc = hook.ExecHook(5);
  }
  ReportTiming("hook that never exits");
  EXPECT_EQ(-1, rc);
  EXPECT_EQ(VLIBC_ERR_EXEC, VLIBCErrGet());
  ExpectGroupGone("hook");
  EXPECT_EQ("5\n", vorntest::ReadFile(kPidDir + "/after"));  // the next program ran after it
  EXPECT_TRUE(log.HasOnce(LOG_ERR, KilledLine(dir + "/10-hang"))) << log.Dump();
  vorntest::Run({"/bin/rm", "-rf", dir});
}

TEST_F(ChildLimitTest, PluginActionOfAHangingHookFails) {
  const std::string dir = "/usr/vorn/etc/hooks/net/hang_plugin";
  ASSERT_EQ(0, vorntest::Run({"/bin/mkdir", "-p", dir}).status);
  ASSERT_TRUE(vorntest::WriteFile(dir + "/10-hang", HangingScript(), 0755));
  PVLIB_PLUGIN h = nullptr;
  ASSERT_EQ(0, VLIBPluginSDKInit("net", "net/hang_plugin", &h));
  int rc;
  {
    vornplatform::ScopedChildLimit limit(kLimitMs);
    rc = VLIBPluginAction_S(h);
  }
  VLIBPluginExit(h);
  ReportTiming("plug-in action of a hanging hook");
  EXPECT_EQ(-1, rc);
  ExpectGroupGone("plug-in hook");
  vorntest::Run({"/bin/rm", "-rf", dir});
}

TEST_F(ChildLimitTest, PlatformActionThatNeverExitsFailsTheCaller) {
  const std::string path = std::string(VORN_PLATFORM_ACTION_DIR) + "/VORNFwRuleHup";
  ASSERT_EQ(0, vorntest::Run({"/bin/mkdir", "-p", VORN_PLATFORM_ACTION_DIR}).status);
  ASSERT_TRUE(vorntest::WriteFile(path, HangingScript(), 0755));
  vorntest::SyslogCapture log;
  int rc;
  {
    vornplatform::ScopedChildLimit limit(kLimitMs);
    rc = VORNFwRuleHup();
  }
  ReportTiming("platform action that never exits");
  EXPECT_EQ(-1, rc);
  EXPECT_EQ(VLIBC_ERR_EXEC, VLIBCErrGet());
  ExpectGroupGone("platform action");
  EXPECT_TRUE(log.HasOnce(LOG_ERR, KilledLine(path))) << log.Dump();
  unlink(path.c_str());
}

TEST_F(ChildLimitTest, PlatformActionWhoseOutputStaysOpenFails) {
  const std::string path = std::string(VORN_PLATFORM_ACTION_DIR) + "/VORNHangOutputTest";
  ASSERT_EQ(0, vorntest::Run({"/bin/mkdir", "-p", VORN_PLATFORM_ACTION_DIR}).status);
  ASSERT_TRUE(vorntest::WriteFile(path, "#!/bin/sh\necho partial\n" + HangingScript().substr(10),
                                  0755));
  vorntest::SyslogCapture log;
  std::string out;
  int rc;
  {
    vornplatform::ScopedChildLimit limit(kLimitMs);
    rc = vornplatform::RunAction("VORNHangOutputTest", {"x"}, &out);
  }
  ReportTiming("platform action with open output");
  EXPECT_EQ(-1, rc);
  ExpectGroupGone("platform action with output");
  EXPECT_TRUE(log.HasOnce(LOG_ERR, KilledLine(path))) << log.Dump();
  unlink(path.c_str());
}

TEST_F(ChildLimitTest, ExecOfAProgramThatNeverExitsIsMinusOne) {
  const std::string path = kPidDir + "/hang.sh";
  ASSERT_TRUE(vorntest::WriteFile(path, HangingScript(), 0755));
  vorntest::SyslogCapture log;
  int rc;
  {
    vornplatform::ScopedChildLimit limit(kLimitMs);
    rc = VLIBCExecl(path.c_str(), 187, "arg", static_cast<const char*>(nullptr));
  }
  ReportTiming("exec that never exits");
  EXPECT_EQ(-1, rc);
  EXPECT_EQ(VLIBC_ERR_EXEC, VLIBCErrGet());
  ExpectGroupGone("exec");
  EXPECT_TRUE(log.HasOnce(LOG_ERR, KilledLine(path))) << log.Dump();
}

TEST_F(ChildLimitTest, PopenWhoseChildNeverExitsEndsTheStreamAndPcloseFails) {
  const std::string path = kPidDir + "/hang-popen.sh";
  ASSERT_TRUE(vorntest::WriteFile(path, "#!/bin/sh\necho first\n" + HangingScript().substr(10),
                                  0755));
  vorntest::SyslogCapture log;
  FILE* fp;
  {
    vornplatform::ScopedChildLimit limit(kLimitMs);
    fp = VLIBCPopen(path.c_str(), "r", static_cast<const char*>(nullptr));
  }
  ASSERT_NE(nullptr, fp);
  char line[64];
  ASSERT_NE(nullptr, fgets(line, sizeof line, fp));
  EXPECT_STREQ("first\n", line);
  // The caller blocks reading; the limit ends the stream.
  EXPECT_EQ(nullptr, fgets(line, sizeof line, fp));
  EXPECT_EQ(-1, VLIBCPclose(fp));
  ReportTiming("popen whose child never exits");
  ExpectGroupGone("popen");
  EXPECT_TRUE(log.HasOnce(LOG_ERR, KilledLine(path))) << log.Dump();
}

TEST_F(ChildLimitTest, PcloseOfAChildThatNeverExitsFailsAtTheLimit) {
  const std::string path = kPidDir + "/hang-pclose.sh";
  // Ignores the end of its input and its output: only the limit ends it.
  ASSERT_TRUE(vorntest::WriteFile(path, HangingScript(), 0755));
  vorntest::SyslogCapture log;
  FILE* fp;
  {
    vornplatform::ScopedChildLimit limit(kLimitMs);
    fp = VLIBCPopen(path.c_str(), "w", static_cast<const char*>(nullptr));
  }
  ASSERT_NE(nullptr, fp);
  // Wait until it has started its grandchild, then close at once.
  for (int i = 0; i < 1000 && ReadPid("leader") <= 0; ++i) usleep(1000);
  EXPECT_EQ(-1, VLIBCPclose(fp));
  ReportTiming("pclose of a child that never exits");
  ExpectGroupGone("pclose");
  EXPECT_TRUE(log.HasOnce(LOG_ERR, KilledLine(path))) << log.Dump();
}

TEST_F(ChildLimitTest, ProgramsThatEndInTimeKeepTheirResult) {
  vornplatform::ScopedChildLimit limit(kLimitMs);
  vorntest::SyslogCapture log;
  EXPECT_EQ(3, VLIBCExec("/bin/sh", "-c", "exit 3", nullptr, nullptr));
  FILE* fp = VLIBCPopen("/bin/echo", "r", "hello", static_cast<const char*>(nullptr));
  ASSERT_NE(nullptr, fp);
  char line[16];
  ASSERT_NE(nullptr, fgets(line, sizeof line, fp));
  EXPECT_STREQ("hello\n", line);
  EXPECT_EQ(0, VLIBCPclose(fp));
  EXPECT_TRUE(log.Matching("killed with its process group").empty()) << log.Dump();
}
