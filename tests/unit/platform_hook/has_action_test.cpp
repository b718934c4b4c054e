// VLIBPluginHasAction: whether firing a hook would run anything, asked before its variables are
// prepared.
#include <gtest/gtest.h>
#include <sys/stat.h>

#include "support/test_util.h"
#include "unit/hook/hook_recorder.h"
#include "vornplatform/hook.h"

namespace {

class HasActionTest : public ::testing::Test {
 protected:
  void SetUp() override { vorntest::RemoveHooks(); }
  void TearDown() override { vorntest::RemoveHooks(); }
};

TEST_F(HasActionTest, OnlyAnExecutableFileCounts) {
  const std::string dir = vorntest::HookDir("net/ipv4_change");
  EXPECT_EQ(VLIBPluginHasAction("net/ipv4_change"), 0);  // no directory
  ASSERT_EQ(vorntest::Run({"/bin/mkdir", "-p", dir + "/subdir"}).status, 0);
  EXPECT_EQ(VLIBPluginHasAction("net/ipv4_change"), 0);  // a directory is no program
  ASSERT_TRUE(vorntest::WriteFile(dir + "/20-readme", "not a program\n", 0644));
  EXPECT_EQ(VLIBPluginHasAction("net/ipv4_change"), 0);  // nor a file without x bit
  ASSERT_TRUE(vorntest::WriteFile(dir + "/30-run", "#!/bin/sh\nexit 0\n", 0755));
  EXPECT_EQ(VLIBPluginHasAction("net/ipv4_change"), 1);
  EXPECT_EQ(VLIBPluginHasAction("net/ipv6_change"), 0);
}

TEST_F(HasActionTest, AnUnusableNameHasNone) {
  ASSERT_TRUE(vorntest::InstallRecordingHook("net/ipv4_change", "10-record"));
  EXPECT_EQ(VLIBPluginHasAction(nullptr), 0);
  EXPECT_EQ(VLIBPluginHasAction(""), 0);
  EXPECT_EQ(VLIBPluginHasAction("/net/ipv4_change"), 0);
  EXPECT_EQ(VLIBPluginHasAction("net/../net/ipv4_change"), 0);
  EXPECT_EQ(VLIBPluginHasAction("net/ipv4_change"), 1);
}

}  // namespace
