// BaseHook and the plug-in functions: which executables run, in which order, with which argv
// and environment, and what an unusable hook does.
#include "vornplatform/hook.h"

#include <gtest/gtest.h>
#include <stdlib.h>

#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "unit/hook/hook_recorder.h"
#include "vornplatform/err.h"

using vornnetsdk::hook::BaseHook;
using vorntest::HookRuns;

namespace {

class HookTest : public ::testing::Test {
 protected:
  void SetUp() override {
    vorntest::RemoveHooks();
    vorntest::ClearHookRuns();
    VLIBCErrClear();
  }
  void TearDown() override {
    vorntest::RemoveHooks();
    vorntest::ClearHookRuns();
  }
};

// A hook that never may fire.
class NeverValidHook : public BaseHook {
 public:
  NeverValidHook() : BaseHook("net", "net/test_hook") {}
  bool IsValid() const override { return false; }
};

}  // namespace

TEST_F(HookTest, SetEnvAndGetEnv) {
  BaseHook hook("net", "net/test_hook");
  EXPECT_EQ(hook.GetCategory(), "net");
  EXPECT_EQ(hook.GetName(), "net/test_hook");
  EXPECT_EQ(hook.GetEnv("ACTION"), "");
  EXPECT_EQ(hook.SetEnv("ACTION", "NEW"), 0);
  EXPECT_EQ(hook.GetEnv("ACTION"), "NEW");
  EXPECT_EQ(hook.SetEnv("ACTION", "DEL"), 0);
  EXPECT_EQ(hook.GetEnv("ACTION"), "DEL");
  EXPECT_EQ(hook.SetEnv("EMPTY", ""), 0);
  EXPECT_EQ(hook.GetEnvs().size(), 2u);
}

TEST_F(HookTest, BadVariablesAreRefusedAndRecorded) {
  BaseHook hook("net", "net/test_hook");
  EXPECT_EQ(hook.SetEnv("", "x"), -1);
  EXPECT_EQ(VLIBCErrGet(), 0xd00);
  VLIBCErrClear();
  EXPECT_EQ(hook.SetEnv("A=B", "x"), -1);
  EXPECT_EQ(VLIBCErrGet(), 0xd00);
  EXPECT_EQ(hook.SetEnv(std::string("A\0B", 3), "x"), -1);
  EXPECT_EQ(hook.SetEnv("A", std::string("x\0y", 3)), -1);
  EXPECT_TRUE(hook.GetEnvs().empty());
}

TEST_F(HookTest, ValidityOfCategoryAndName) {
  EXPECT_TRUE(BaseHook("net", "net/gateway_change").IsValid());
  EXPECT_FALSE(BaseHook("", "net/gateway_change").IsValid());
  EXPECT_FALSE(BaseHook("net", "").IsValid());
  EXPECT_FALSE(BaseHook("net", "/usr/bin").IsValid());
  EXPECT_FALSE(BaseHook("net", "net/../../../bin").IsValid());
  EXPECT_FALSE(BaseHook("net", "net//x").IsValid());
  EXPECT_FALSE(BaseHook("net", "net/").IsValid());
  EXPECT_FALSE(BaseHook("net", ".").IsValid());
}

TEST_F(HookTest, RunsEveryExecutableInNameOrderWithActionAndVariables) {
  ASSERT_TRUE(vorntest::InstallRecordingHook("net/test_hook", "20-second"));
  ASSERT_TRUE(vorntest::InstallRecordingHook("net/test_hook", "10-first"));
  ASSERT_TRUE(vorntest::InstallRecordingHook("net/test_hook", "30-third"));
  ASSERT_TRUE(vorntest::InstallRecordingHook("net/test_hook", "15-not-executable", 0644));
  ASSERT_TRUE(
      vorntest::Run({"/bin/mkdir", "-p", "/usr/vorn/etc/hooks/net/test_hook/12-dir"}).status == 0);
  ASSERT_EQ(setenv("VORN_HOOK_TEST_INHERITED", "kept", 1), 0);
  ASSERT_EQ(setenv("ACTION", "from-caller", 1), 0);

  BaseHook hook("net", "net/test_hook");
  ASSERT_EQ(hook.SetEnv("ACTION", "NEW"), 0);
  ASSERT_EQ(hook.SetEnv("IFNAME", "eth0"), 0);
  EXPECT_EQ(hook.ExecHook(5), 0);
  unsetenv("VORN_HOOK_TEST_INHERITED");
  unsetenv("ACTION");

  auto runs = HookRuns();
  ASSERT_EQ(runs.size(), 3u);
  const char* order[] = {"10-first", "20-second", "30-third"};
  for (int i = 0; i < 3; ++i) {
    EXPECT_EQ(runs[i].program, std::string("/usr/vorn/etc/hooks/net/test_hook/") + order[i]);
    EXPECT_EQ(runs[i].args, std::vector<std::string>{"5"});
    EXPECT_EQ(runs[i].env["ACTION"], "NEW");  // the hook's variable wins over the caller's
    EXPECT_EQ(runs[i].env["IFNAME"], "eth0");
    EXPECT_EQ(runs[i].env["VORN_HOOK_TEST_INHERITED"], "kept");
  }
}

TEST_F(HookTest, ActionNumberIsArgvOne) {
  ASSERT_TRUE(vorntest::InstallRecordingHook("net/test_hook", "a"));
  BaseHook hook("net", "net/test_hook");
  EXPECT_EQ(hook.ExecHook(4), 0);
  EXPECT_EQ(hook.ExecHook(5), 0);
  auto runs = HookRuns();
  ASSERT_EQ(runs.size(), 2u);
  EXPECT_EQ(runs[0].args, std::vector<std::string>{"4"});
  EXPECT_EQ(runs[1].args, std::vector<std::string>{"5"});
}

TEST_F(HookTest, NoShellBetweenHookAndValues) {
  // Names and values with shell syntax reach the hook as they are.
  ASSERT_TRUE(vorntest::InstallRecordingHook("net/test_hook", "10 a;touch $HOME"));
  BaseHook hook("net", "net/test_hook");
  ASSERT_EQ(hook.SetEnv("IFNAME", "eth0; touch /run/hook-pwned $(id)"), 0);
  EXPECT_EQ(hook.ExecHook(5), 0);
  auto runs = HookRuns();
  ASSERT_EQ(runs.size(), 1u);
  EXPECT_EQ(runs[0].program, "/usr/vorn/etc/hooks/net/test_hook/10 a;touch $HOME");
  EXPECT_EQ(runs[0].env["IFNAME"], "eth0; touch /run/hook-pwned $(id)");
  EXPECT_FALSE(vorntest::Exists("/run/hook-pwned"));
}

TEST_F(HookTest, AFailingHookDoesNotStopTheNext) {
  vorntest::SyslogCapture log;
  ASSERT_TRUE(vorntest::Run({"/bin/mkdir", "-p", "/usr/vorn/etc/hooks/net/test_hook"}).status == 0);
  ASSERT_TRUE(vorntest::WriteFile("/usr/vorn/etc/hooks/net/test_hook/10-fails",
                                  "#!/bin/sh\nexit 3\n", 0755));
  ASSERT_TRUE(vorntest::WriteFile("/usr/vorn/etc/hooks/net/test_hook/20-garbage",
                                  "no interpreter line\n", 0755));
  ASSERT_TRUE(vorntest::InstallRecordingHook("net/test_hook", "30-records"));
  BaseHook hook("net", "net/test_hook");
  EXPECT_EQ(hook.ExecHook(5), 0);
  EXPECT_EQ(HookRuns().size(), 1u);
  EXPECT_TRUE(log.HasOnce(
      LOG_ERR,
      vorntest::LogLine(
          "hook.cpp",
          "Failed to run hook [/usr/vorn/etc/hooks/net/test_hook/20-garbage]: Exec format error")))
      << log.Dump();
}

TEST_F(HookTest, NothingInstalledIsFine) {
  BaseHook hook("net", "net/test_hook");
  EXPECT_EQ(hook.ExecHook(5), 0);
  EXPECT_TRUE(HookRuns().empty());
}

TEST_F(HookTest, AnInvalidHookIsNotFired) {
  ASSERT_TRUE(vorntest::InstallRecordingHook("net/test_hook", "a"));
  NeverValidHook hook;
  EXPECT_EQ(hook.ExecHook(5), -1);
  EXPECT_EQ(VLIBCErrGet(), 0xd00);
  EXPECT_TRUE(HookRuns().empty());

  // A name leaving the hook directory is not valid either.
  ASSERT_TRUE(vorntest::InstallRecordingHook("x", "a"));
  BaseHook escaping("net", "net/../x");
  EXPECT_EQ(escaping.ExecHook(5), -1);
  EXPECT_TRUE(HookRuns().empty());
}

TEST_F(HookTest, PluginFiresWithActionFive) {
  ASSERT_TRUE(vorntest::InstallRecordingHook("net/ipv4_change", "a"));
  PVLIB_PLUGIN handle = nullptr;
  ASSERT_EQ(VLIBPluginSDKInit("net", "net/ipv4_change", &handle), 0);
  ASSERT_NE(handle, nullptr);
  EXPECT_EQ(VLIBPluginSetArg(handle, "IFNAME", "eth0"), 0);
  EXPECT_EQ(VLIBPluginSetArg(handle, "IS_LINK", "true"), 0);
  EXPECT_EQ(VLIBPluginAction_S(handle), 0);
  EXPECT_EQ(VLIBPluginExit(handle), 0);
  auto runs = HookRuns();
  ASSERT_EQ(runs.size(), 1u);
  EXPECT_EQ(runs[0].program, "/usr/vorn/etc/hooks/net/ipv4_change/a");
  EXPECT_EQ(runs[0].args, std::vector<std::string>{"5"});
  EXPECT_EQ(runs[0].env["IFNAME"], "eth0");
  EXPECT_EQ(runs[0].env["IS_LINK"], "true");
}

TEST_F(HookTest, PluginBadParameters) {
  PVLIB_PLUGIN handle = reinterpret_cast<PVLIB_PLUGIN>(1);
  EXPECT_EQ(VLIBPluginSDKInit("net", "../x", &handle), -1);
  EXPECT_EQ(handle, nullptr);
  EXPECT_EQ(VLIBCErrGet(), 0xd00);
  EXPECT_EQ(VLIBPluginSDKInit("net", nullptr, &handle), -1);
  EXPECT_EQ(VLIBPluginSDKInit(nullptr, "net/x", &handle), -1);
  EXPECT_EQ(VLIBPluginSDKInit("", "net/x", &handle), -1);
  EXPECT_EQ(VLIBPluginSDKInit("net", "net/x", nullptr), -1);
  EXPECT_EQ(VLIBPluginSetArg(nullptr, "A", "b"), -1);
  EXPECT_EQ(VLIBPluginAction_S(nullptr), -1);
  EXPECT_EQ(VLIBPluginExit(nullptr), 0);

  ASSERT_EQ(VLIBPluginSDKInit("net", "net/x", &handle), 0);
  EXPECT_EQ(VLIBPluginSetArg(handle, nullptr, "b"), -1);
  EXPECT_EQ(VLIBPluginSetArg(handle, "A", nullptr), -1);
  EXPECT_EQ(VLIBPluginSetArg(handle, "A=B", "b"), -1);
  EXPECT_EQ(VLIBPluginExit(handle), 0);
}
