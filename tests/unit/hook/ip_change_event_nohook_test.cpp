// NetIPChangeEvent with nothing installed for the hook: nothing runs, so nothing is prepared,
// not even the link test (an address flood on a box without listeners stays cheap).
#include <gtest/gtest.h>

#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "unit/hook/hook_recorder.h"
#include "vornwireless/hook/ip_change_event.h"

using vornwireless::hook::IPTYPE_IPV4;
using vornwireless::hook::IPTYPE_IPV6;
using vornwireless::hook::NetIPChangeEvent;

namespace {

TEST(IPChangeEventWithoutHook, NoLinkTestForAHookNothingIsInstalledFor) {
  vorntest::RemoveHooks();
  vorntest::SyslogCapture log;
  // An interface that does not exist would fail the link test; without a hook it is not made.
  EXPECT_EQ(NetIPChangeEvent(IPTYPE_IPV4, "nosuch0", "", "10.0.0.1", 24), 0);
  EXPECT_EQ(NetIPChangeEvent(IPTYPE_IPV6, "nosuch0", "", "fd00::1", 64), 0);
  EXPECT_TRUE(log.Matching("error on link detect").empty()) << log.Dump();
  // Bad parameters are still refused first.
  EXPECT_EQ(NetIPChangeEvent(IPTYPE_IPV6, "nosuch0", "", "fd00::1", 129), -1);
  // With a hook installed for the other family only, this one still makes no link test.
  ASSERT_TRUE(vorntest::InstallRecordingHook("net/ipv6_change", "10-record"));
  EXPECT_EQ(NetIPChangeEvent(IPTYPE_IPV4, "nosuch0", "", "10.0.0.1", 24), 0);
  EXPECT_TRUE(log.Matching("error on link detect").empty()) << log.Dump();
  EXPECT_EQ(NetIPChangeEvent(IPTYPE_IPV6, "nosuch0", "", "fd00::1", 64), -1);
  EXPECT_EQ(log.Matching("error on link detect").size(), 1u) << log.Dump();
  vorntest::RemoveHooks();
}

}  // namespace
