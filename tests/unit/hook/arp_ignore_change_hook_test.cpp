#include "vornwireless/hook/arp_ignore_change_hook.h"

#include <gtest/gtest.h>

#include "unit/hook/hook_recorder.h"

using vornwireless::hook::ArpIgnoreChangeHook;

TEST(ArpIgnoreChangeHook, NameCategoryAndValue) {
  ArpIgnoreChangeHook on(true);
  EXPECT_EQ(on.GetCategory(), "net");
  EXPECT_EQ(on.GetName(), "net/arp_ignore_change");
  EXPECT_EQ(on.GetEnv("NEW_VALUE"), "true");
  EXPECT_EQ(on.GetEnvs().size(), 1u);
  EXPECT_TRUE(on.IsValid());
  EXPECT_EQ(ArpIgnoreChangeHook(false).GetEnv("NEW_VALUE"), "false");
}

TEST(ArpIgnoreChangeHook, FiresTheHookDirectory) {
  vorntest::ClearHookRuns();
  ASSERT_TRUE(vorntest::InstallRecordingHook("net/arp_ignore_change", "50-record"));
  ArpIgnoreChangeHook hook(false);
  EXPECT_EQ(hook.ExecHook(5), 0);
  auto runs = vorntest::HookRuns();
  ASSERT_EQ(runs.size(), 1u);
  EXPECT_EQ(runs[0].program, "/usr/vorn/etc/hooks/net/arp_ignore_change/50-record");
  EXPECT_EQ(runs[0].args, std::vector<std::string>{"5"});
  EXPECT_EQ(runs[0].env["NEW_VALUE"], "false");
}
