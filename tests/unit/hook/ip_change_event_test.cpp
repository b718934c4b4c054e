// The address-change event on a veth whose peer goes down and up.
#include "vornwireless/hook/ip_change_event.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>

#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "unit/hook/hook_recorder.h"
#include "vornplatform/err.h"

using vornwireless::hook::_tag_IPTYPE;
using vornwireless::hook::IPTYPE_IPV4;
using vornwireless::hook::IPTYPE_IPV6;
using vornwireless::hook::NetIPChangeEvent;

namespace {

void SetPeer(bool up) {
  std::string why;
  ASSERT_TRUE(vorntest::SetPeerLink("eth0", up, &why)) << why;
}

class IPChangeEventTest : public ::testing::Test {
 protected:
  void SetUp() override {
    vorntest::RemoveHooks();
    vorntest::ClearHookRuns();
    ASSERT_TRUE(vorntest::InstallRecordingHook("net/ipv4_change", "10-record"));
    ASSERT_TRUE(vorntest::InstallRecordingHook("net/ipv6_change", "10-record"));
    VLIBCErrClear();
  }
  void TearDown() override { SetPeer(true); }
};

}  // namespace

TEST_F(IPChangeEventTest, IPv4CarriesItsVariables) {
  EXPECT_EQ(NetIPChangeEvent(IPTYPE_IPV4, "eth0", "none", "10.200.1.2", 24), 0);
  auto runs = vorntest::HookRuns();
  ASSERT_EQ(runs.size(), 1u);
  EXPECT_EQ(runs[0].program, "/usr/vorn/etc/hooks/net/ipv4_change/10-record");
  EXPECT_EQ(runs[0].args, std::vector<std::string>{"5"});
  EXPECT_EQ(runs[0].env["IFNAME"], "eth0");
  EXPECT_EQ(runs[0].env["ORIGIN_ADDRESS"], "none");
  EXPECT_EQ(runs[0].env["NEW_ADDRESS"], "10.200.1.2");
  EXPECT_EQ(runs[0].env["PREFIX_LENGTH"], "-1");
  EXPECT_EQ(runs[0].env["IS_LINK"], "true");
}

TEST_F(IPChangeEventTest, IPv6CarriesTheDecimalPrefix) {
  EXPECT_EQ(NetIPChangeEvent(IPTYPE_IPV6, "eth0", "fe80::1,2001:db8::5", "2001:db8::2", 64), 0);
  auto runs = vorntest::HookRuns();
  ASSERT_EQ(runs.size(), 1u);
  EXPECT_EQ(runs[0].program, "/usr/vorn/etc/hooks/net/ipv6_change/10-record");
  EXPECT_EQ(runs[0].args, std::vector<std::string>{"5"});
  EXPECT_EQ(runs[0].env["ORIGIN_ADDRESS"], "fe80::1,2001:db8::5");
  EXPECT_EQ(runs[0].env["NEW_ADDRESS"], "2001:db8::2");
  EXPECT_EQ(runs[0].env["PREFIX_LENGTH"], "64");
  EXPECT_EQ(runs[0].env["IS_LINK"], "true");
}

TEST_F(IPChangeEventTest, NoLinkIsReported) {
  SetPeer(false);
  EXPECT_EQ(NetIPChangeEvent(IPTYPE_IPV4, "eth0", "", "10.200.1.2", 32), 0);
  auto runs = vorntest::HookRuns();
  ASSERT_EQ(runs.size(), 1u);
  EXPECT_EQ(runs[0].env["IS_LINK"], "false");
  EXPECT_EQ(runs[0].env["ORIGIN_ADDRESS"], "");
}

TEST_F(IPChangeEventTest, LimitsOfThePrefix) {
  EXPECT_EQ(NetIPChangeEvent(IPTYPE_IPV4, "eth0", "", "10.200.1.2", 0), 0);
  EXPECT_EQ(NetIPChangeEvent(IPTYPE_IPV6, "eth0", "", "2001:db8::2", 128), 0);
  EXPECT_EQ(vorntest::HookRuns().size(), 2u);
  EXPECT_EQ(NetIPChangeEvent(IPTYPE_IPV4, "eth0", "", "10.200.1.2", 33), -1);
  EXPECT_EQ(VLIBCErrGet(), 0xd00);
  VLIBCErrClear();
  EXPECT_EQ(NetIPChangeEvent(IPTYPE_IPV4, "eth0", "", "10.200.1.2", -1), -1);
  EXPECT_EQ(VLIBCErrGet(), 0xd00);
  VLIBCErrClear();
  EXPECT_EQ(NetIPChangeEvent(IPTYPE_IPV6, "eth0", "", "2001:db8::2", -5), -1);
  EXPECT_EQ(VLIBCErrGet(), 0xd00);
  EXPECT_EQ(vorntest::HookRuns().size(), 2u);
}

TEST_F(IPChangeEventTest, IPv6Prefix129FailsBeforeTheLinkTest) {
  vorntest::SyslogCapture log;
  // An interface that does not exist would make the link test fail: it is never reached.
  EXPECT_EQ(NetIPChangeEvent(IPTYPE_IPV6, "nosuch0", "", "2001:db8::2", 129), -1);
  EXPECT_EQ(VLIBCErrGet(), 0xd00);
  EXPECT_TRUE(log.Lines().empty()) << log.Dump();
  EXPECT_TRUE(vorntest::HookRuns().empty());
}

TEST_F(IPChangeEventTest, BadParametersRecordTheError) {
  EXPECT_EQ(NetIPChangeEvent(IPTYPE_IPV4, "", "", "10.200.1.2", 24), -1);
  EXPECT_EQ(VLIBCErrGet(), 0xd00);
  VLIBCErrClear();
  EXPECT_EQ(NetIPChangeEvent(IPTYPE_IPV4, "eth0", "10.200.1.2", "", 24), -1);
  EXPECT_EQ(VLIBCErrGet(), 0xd00);
  VLIBCErrClear();
  EXPECT_EQ(NetIPChangeEvent(static_cast<_tag_IPTYPE>(2), "eth0", "", "10.200.1.2", 24), -1);
  EXPECT_EQ(VLIBCErrGet(), 0xd00);
  EXPECT_TRUE(vorntest::HookRuns().empty());
}

TEST_F(IPChangeEventTest, LinkDetectFailure) {
  vorntest::SyslogCapture log;
  EXPECT_EQ(NetIPChangeEvent(IPTYPE_IPV4, "nosuch0", "", "10.0.0.1", 24), -1);
  EXPECT_TRUE(
      log.HasOnce(LOG_ERR, vorntest::LogLine("hook/ip_change_event.cpp", "error on link detect")))
      << log.Dump();
  EXPECT_TRUE(vorntest::HookRuns().empty());
}

TEST_F(IPChangeEventTest, NoHookInstalledIsASuccess) {
  vorntest::RemoveHooks();
  EXPECT_EQ(NetIPChangeEvent(IPTYPE_IPV4, "eth0", "", "10.200.1.2", 24), 0);
  EXPECT_TRUE(vorntest::HookRuns().empty());
}
