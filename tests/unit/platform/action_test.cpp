#include "vornplatform/action.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <string>
#include <vector>

#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "vornplatform/err.h"

namespace {

using vorntest::WriteFile;

const std::string kDir = VORN_PLATFORM_ACTION_DIR;

TEST(ActionTest, MissingActionIsASuccessfulNoOp) {
  std::string out = "stale";
  EXPECT_EQ(vornplatform::RunAction("VornNoSuchAction", {"a"}, &out), 0);
  EXPECT_EQ(out, "");
  EXPECT_EQ(vornplatform::RunAction("VornNoSuchAction", {}), 0);
}

TEST(ActionTest, MissingActionIsLoggedAtDebug) {
  ASSERT_TRUE(vorntest::SyslogCapture::Available()) << "no syslog catcher outside the sandbox";
  vorntest::SyslogCapture log;
  EXPECT_EQ(vornplatform::RunAction("VornNoSuchAction", {}), 0);
  EXPECT_TRUE(log.HasOnce(
      LOG_DEBUG, vorntest::LogLine("action.cpp", "platform action VornNoSuchAction not installed")))
      << log.Dump();
}

TEST(ActionTest, BadNamesAreRefused) {
  for (const char* name : {static_cast<const char*>(nullptr), "", ".", "..", "../bin/sh", "a/b"}) {
    VLIBCErrClear();
    std::string out = "stale";
    EXPECT_EQ(vornplatform::RunAction(name, {}, &out), -1) << (name ? name : "NULL");
    EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_BAD_PARAMETER);
    EXPECT_EQ(out, "");
  }
}

TEST(ActionTest, FirewallReloadWithoutActionSucceeds) {
  struct stat st;
  ASSERT_NE(0, stat((kDir + "/VORNFwRuleHup").c_str(), &st)) << "an action is installed";
  EXPECT_EQ(VORNFwRuleHup(), 0);
  EXPECT_EQ(VORNFwTcRuleHup(), 0);
}

// Installing actions needs the sandbox's overlay on /usr.
class InstalledActionTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox()) << "installs into " VORN_PLATFORM_ACTION_DIR;
    ASSERT_EQ(vorntest::Run({"/bin/mkdir", "-p", kDir}).status, 0);
    VLIBCErrClear();
  }
  void TearDown() override {
    for (const auto& n : installed_) unlink((kDir + "/" + n).c_str());
  }
  void Install(const std::string& name, const std::string& script, int mode = 0755) {
    ASSERT_TRUE(WriteFile(kDir + "/" + name, script, mode));
    installed_.push_back(name);
  }
  std::vector<std::string> installed_;
};

TEST_F(InstalledActionTest, ArgvStdoutAndExitStatus) {
  Install("VornTestEcho", "#!/bin/sh\nprintf '%s\\n' \"$0\" \"$@\"\nexit 3\n");
  std::string out;
  EXPECT_EQ(vornplatform::RunAction("VornTestEcho", {"a b", "--x", "", "$HOME;*"}, &out), 3);
  EXPECT_EQ(out, kDir + "/VornTestEcho\na b\n--x\n\n$HOME;*\n");
}

TEST_F(InstalledActionTest, StdinIsEmptyAndLongOutputIsReadWhole) {
  Install("VornTestCat", "#!/bin/sh\ncat\nhead -c 300000 /dev/zero | tr '\\0' x\n");
  std::string out;
  EXPECT_EQ(vornplatform::RunAction("VornTestCat", {}, &out), 0);
  EXPECT_EQ(out, std::string(300000, 'x'));
}

TEST_F(InstalledActionTest, SignalOrUnrunnableActionIsMinusOne) {
  Install("VornTestKilled", "#!/bin/sh\nkill -KILL $$\n");
  EXPECT_EQ(vornplatform::RunAction("VornTestKilled", {}), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_EXEC);
  Install("VornTestNoExec", "#!/bin/sh\nexit 0\n", 0644);
  VLIBCErrClear();
  EXPECT_EQ(vornplatform::RunAction("VornTestNoExec", {}), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_EXEC);
}

TEST_F(InstalledActionTest, FirewallReloadsFollowTheExitStatus) {
  const std::string journal = kDir + "/fw.journal";
  installed_.push_back("fw.journal");
  Install("VORNFwRuleHup", "#!/bin/sh\necho fw >> " + journal + "\nexit 0\n");
  Install("VORNFwTcRuleHup", "#!/bin/sh\necho tc >> " + journal + "\nexit 2\n");
  EXPECT_EQ(VORNFwRuleHup(), 0);
  VLIBCErrClear();
  EXPECT_EQ(VORNFwTcRuleHup(), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_EXEC);
  EXPECT_STREQ(VLIBCErrGetFile(), "action.cpp");
  EXPECT_EQ(vorntest::ReadFile(journal), "fw\ntc\n");
}

}  // namespace
