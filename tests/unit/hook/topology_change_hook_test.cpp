#include "vornwireless/hook/topology_change_hook.h"

#include <gtest/gtest.h>

#include "unit/hook/hook_recorder.h"
#include "vornplatform/err.h"

using vornwireless::hook::TopologyChangeHook;

TEST(TopologyChangeHook, NameAndVariables) {
  TopologyChangeHook hook("bridge", "router");
  EXPECT_EQ(hook.GetCategory(), "net");
  EXPECT_EQ(hook.GetName(), "net/topology_change");
  EXPECT_EQ(hook.GetEnv("OLD_TOPOLOGY"), "bridge");
  EXPECT_EQ(hook.GetEnv("NEW_TOPOLOGY"), "router");
  EXPECT_EQ(hook.GetEnvs().size(), 2u);
  EXPECT_TRUE(hook.IsValid());
}

TEST(TopologyChangeHook, EmptyTopologyIsNotValid) {
  EXPECT_FALSE(TopologyChangeHook("bridge", "").IsValid());
  EXPECT_FALSE(TopologyChangeHook("", "router").IsValid());
  EXPECT_FALSE(TopologyChangeHook("", "").IsValid());
}

TEST(TopologyChangeHook, AnInvalidHookIsNotFired) {
  vorntest::ClearHookRuns();
  ASSERT_TRUE(vorntest::InstallRecordingHook("net/topology_change", "10-record"));
  TopologyChangeHook hook("bridge", "");
  VLIBCErrClear();
  EXPECT_EQ(hook.ExecHook(4), -1);
  EXPECT_EQ(VLIBCErrGet(), 0xd00);
  EXPECT_TRUE(vorntest::HookRuns().empty());
}

TEST(TopologyChangeHook, BeforeAndAfterTheSwitch) {
  vorntest::ClearHookRuns();
  ASSERT_TRUE(vorntest::InstallRecordingHook("net/topology_change", "10-record"));
  TopologyChangeHook hook("bridge", "client");
  EXPECT_EQ(hook.ExecHook(4), 0);
  EXPECT_EQ(hook.ExecHook(5), 0);
  auto runs = vorntest::HookRuns();
  ASSERT_EQ(runs.size(), 2u);
  EXPECT_EQ(runs[0].args, std::vector<std::string>{"4"});
  EXPECT_EQ(runs[1].args, std::vector<std::string>{"5"});
  for (auto& run : runs) {
    EXPECT_EQ(run.program, "/usr/vorn/etc/hooks/net/topology_change/10-record");
    EXPECT_EQ(run.env["OLD_TOPOLOGY"], "bridge");
    EXPECT_EQ(run.env["NEW_TOPOLOGY"], "client");
  }
}
