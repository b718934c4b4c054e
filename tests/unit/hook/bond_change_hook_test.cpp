#include "vornwireless/hook/bond_change_hook.h"

#include <gtest/gtest.h>

#include "unit/hook/hook_recorder.h"

using vornwireless::hook::BondChangeHook;

TEST(BondChangeHook, NameAndAction) {
  BondChangeHook hook("up");
  EXPECT_EQ(hook.GetCategory(), "net");
  EXPECT_EQ(hook.GetName(), "net/bond_change");
  EXPECT_EQ(hook.GetEnv("ACTION"), "up");
  EXPECT_EQ(hook.GetEnvs().size(), 1u);
  EXPECT_TRUE(hook.IsValid());
}

TEST(BondChangeHook, ValidityIsInherited) {
  // No required variable: an empty action still names a usable hook.
  EXPECT_TRUE(BondChangeHook("").IsValid());
}

TEST(BondChangeHook, FiresWithItsAction) {
  vorntest::ClearHookRuns();
  ASSERT_TRUE(vorntest::InstallRecordingHook("net/bond_change", "10-record"));
  BondChangeHook hook("down");
  EXPECT_EQ(hook.ExecHook(5), 0);
  auto runs = vorntest::HookRuns();
  ASSERT_EQ(runs.size(), 1u);
  EXPECT_EQ(runs[0].program, "/usr/vorn/etc/hooks/net/bond_change/10-record");
  EXPECT_EQ(runs[0].args, std::vector<std::string>{"5"});
  EXPECT_EQ(runs[0].env["ACTION"], "down");
}
