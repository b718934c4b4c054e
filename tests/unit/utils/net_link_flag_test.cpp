// The link-processing flag file and its pid.
#include "vornwireless/utils/net_link_flag.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include "support/syslog_capture.h"
#include "support/test_util.h"

using namespace vornwireless::utils;
using vorntest::LogLine;
using vorntest::SyslogCapture;

class NetLinkFlag : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox()) << "needs the sandbox (private /tmp)";
    vorntest::Run({"/bin/rm", "-rf", kNetLinkFlagFile});
  }
};

TEST_F(NetLinkFlag, SetHoldsOurPidAndUnsetRemovesIt) {
  EXPECT_FALSE(IsNetLinkProcessing());
  SetNetLinkIsProcessing();
  EXPECT_EQ(std::to_string(getpid()) + "\n", vorntest::ReadFile(kNetLinkFlagFile));
  EXPECT_TRUE(IsNetLinkProcessing());
  UnsetNetLinkIsProcessing();
  EXPECT_FALSE(vorntest::Exists(kNetLinkFlagFile));
  EXPECT_FALSE(IsNetLinkProcessing());
}

TEST_F(NetLinkFlag, ADeadWriterDoesNotBlock) {
  pid_t pid = fork();
  if (pid == 0) {
    SetNetLinkIsProcessing();
    _exit(0);
  }
  waitpid(pid, nullptr, 0);
  EXPECT_EQ(std::to_string(pid) + "\n", vorntest::ReadFile(kNetLinkFlagFile));
  EXPECT_FALSE(IsNetLinkProcessing());
}

TEST_F(NetLinkFlag, GarbageOrZeroPidDoesNotBlock) {
  ASSERT_TRUE(vorntest::WriteFile(kNetLinkFlagFile, "garbage\n"));
  EXPECT_FALSE(IsNetLinkProcessing());
  ASSERT_TRUE(vorntest::WriteFile(kNetLinkFlagFile, "0\n"));
  EXPECT_FALSE(IsNetLinkProcessing());
}

TEST_F(NetLinkFlag, UnsetOfAnAbsentFlagIsQuiet) {
  SyslogCapture log;
  UnsetNetLinkIsProcessing();
  EXPECT_TRUE(log.Lines().empty()) << log.Dump();
}

TEST_F(NetLinkFlag, FailuresAreLogged) {
  ASSERT_EQ(0, mkdir(kNetLinkFlagFile, 0755));
  ASSERT_TRUE(vorntest::WriteFile(std::string(kNetLinkFlagFile) + "/x", ""));
  SyslogCapture log;
  SetNetLinkIsProcessing();
  UnsetNetLinkIsProcessing();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/net_link_flag.cpp",
                                           "Failed to write pid file: /tmp/.net_link_is_processing")))
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/net_link_flag.cpp",
                                           "Failed to unlike pid file: /tmp/.net_link_is_processing")))
      << log.Dump();
  vorntest::Run({"/bin/rm", "-rf", kNetLinkFlagFile});
}
