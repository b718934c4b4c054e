#include "vornwireless/hook/gateway_change_hook.h"

#include <gtest/gtest.h>

#include "unit/hook/hook_recorder.h"
#include "vornplatform/err.h"

using vornwireless::hook::GatewayChangeHook;

TEST(GatewayChangeHook, NameAndVariables) {
  GatewayChangeHook hook("NEW", "eth0", "10.1.0.0", "10.200.1.1");
  EXPECT_EQ(hook.GetCategory(), "net");
  EXPECT_EQ(hook.GetName(), "net/gateway_change");
  EXPECT_EQ(hook.GetEnv("ACTION"), "NEW");
  EXPECT_EQ(hook.GetEnv("IFNAME"), "eth0");
  EXPECT_EQ(hook.GetEnv("DESTINATION"), "10.1.0.0");
  EXPECT_EQ(hook.GetEnv("GATEWAY"), "10.200.1.1");
  EXPECT_EQ(hook.GetEnvs().size(), 4u);
  EXPECT_TRUE(hook.IsValid());
}

TEST(GatewayChangeHook, EmptyDestinationAndGatewayCarryZeros) {
  GatewayChangeHook hook("DEL", "eth0", "", "");
  EXPECT_EQ(hook.GetEnv("DESTINATION"), "0.0.0.0");
  EXPECT_EQ(hook.GetEnv("GATEWAY"), "0.0.0.0");
  EXPECT_TRUE(hook.IsValid());
}

TEST(GatewayChangeHook, ActionAndIfnameAreRequired) {
  EXPECT_FALSE(GatewayChangeHook("", "eth0", "", "").IsValid());
  EXPECT_FALSE(GatewayChangeHook("NEW", "", "", "").IsValid());
}

TEST(GatewayChangeHook, FiresWithActionFive) {
  vorntest::ClearHookRuns();
  ASSERT_TRUE(vorntest::InstallRecordingHook("net/gateway_change", "20-b"));
  ASSERT_TRUE(vorntest::InstallRecordingHook("net/gateway_change", "10-a"));
  GatewayChangeHook hook("NEW", "eth0", "", "10.200.1.1");
  EXPECT_EQ(hook.ExecHook(5), 0);
  auto runs = vorntest::HookRuns();
  ASSERT_EQ(runs.size(), 2u);
  EXPECT_EQ(runs[0].program, "/usr/vorn/etc/hooks/net/gateway_change/10-a");
  EXPECT_EQ(runs[1].program, "/usr/vorn/etc/hooks/net/gateway_change/20-b");
  for (auto& run : runs) {
    EXPECT_EQ(run.args, std::vector<std::string>{"5"});
    EXPECT_EQ(run.env["ACTION"], "NEW");
    EXPECT_EQ(run.env["IFNAME"], "eth0");
    EXPECT_EQ(run.env["DESTINATION"], "0.0.0.0");
    EXPECT_EQ(run.env["GATEWAY"], "10.200.1.1");
  }
}

TEST(GatewayChangeHook, AnInvalidHookIsNotFired) {
  vorntest::ClearHookRuns();
  ASSERT_TRUE(vorntest::InstallRecordingHook("net/gateway_change", "10-a"));
  GatewayChangeHook hook("NEW", "", "", "");
  VLIBCErrClear();
  EXPECT_EQ(hook.ExecHook(5), -1);
  EXPECT_EQ(VLIBCErrGet(), 0xd00);
  EXPECT_TRUE(vorntest::HookRuns().empty());
}
