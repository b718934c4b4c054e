// The link watcher inside the real vornnetd, fed by the kernel: cables pulled and plugged on the
// veth uplinks, addresses and main-table routes changed with /sbin/ip. What is observed is what
// the platform sees: its link-event actions and the change hooks, each a recording fake.
#include <gtest/gtest.h>
#include <signal.h>
#include <stdlib.h>
#include <unistd.h>

#include <chrono>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "fixtures/fake_journal.h"
#include "support/daemon_process.h"
#include "support/test_util.h"

namespace {

using vorntest::FakeCall;
using vorntest::FakeCallsTo;

const std::string kLinkUp = "/usr/vorn/libexec/platform/VLIBNetIfLinkUpEvent";
const std::string kLinkDown = "/usr/vorn/libexec/platform/VLIBNetIfLinkDownEvent";
const std::string kIPv4Hook = "/usr/vorn/etc/hooks/net/ipv4_change/50-record";
const std::string kIPv6Hook = "/usr/vorn/etc/hooks/net/ipv6_change/50-record";
const std::string kGatewayHook = "/usr/vorn/etc/hooks/net/gateway_change/50-record";

int Ip(std::vector<std::string> args) { return vorntest::Ip(std::move(args)).status; }

// Waits (5 s at most) until `program` has at least `count` calls; the calls.
std::vector<FakeCall> WaitCalls(const std::string& program, std::size_t count) {
  auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(5);
  std::vector<FakeCall> calls = FakeCallsTo(program);
  while (calls.size() < count && std::chrono::steady_clock::now() < deadline) {
    std::this_thread::sleep_for(std::chrono::milliseconds(20));
    calls = FakeCallsTo(program);
  }
  return calls;
}

// The watcher reads in order: once a later marker change has been reported, every earlier
// message has been handled. The marker is a main-table route on eth1, added and deleted. A
// watcher that has only just started may miss the first marker, so a new one is sent (five at
// most); when none is reported, the test fails.
void Settle() {
  static int n = 0;
  for (int attempt = 0; attempt < 5; ++attempt) {
    std::string dst = "10.201." + std::to_string(++n % 250) + ".0/24";
    std::size_t before = FakeCallsTo(kGatewayHook).size();
    ASSERT_EQ(0, Ip({"route", "add", dst, "dev", "eth1"}));
    ASSERT_EQ(0, Ip({"route", "del", dst, "dev", "eth1"}));
    if (WaitCalls(kGatewayHook, before + 2).size() >= before + 2) return;
  }
  FAIL() << "the watcher reported none of five marker routes";
}

class LinkWatch : public testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    for (auto const& p : {kLinkUp, kLinkDown, kIPv4Hook, kIPv6Hook, kGatewayHook}) {
      ASSERT_TRUE(vorntest::InstallFake(p)) << p;
    }
    setenv("VORN_FAKE_ENV",
           "IFNAME,ORIGIN_ADDRESS,NEW_ADDRESS,PREFIX_LENGTH,IS_LINK,ACTION,DESTINATION,GATEWAY", 1);
    std::string why;
    ASSERT_TRUE(vorntest::SetPeerLink("eth0", true, &why)) << why;
    daemon_ = std::make_unique<vorntest::DaemonProcess>(std::vector<std::string>{VORNNETD},
                                                        "com.vornlink.net");
    ASSERT_TRUE(daemon_->ready());
    Settle();
    vorntest::ClearFakeJournal();
  }
  void TearDown() override {
    if (daemon_) {
      EXPECT_EQ(0, daemon_->Stop(SIGTERM));
    }
    for (auto const& p : {kLinkUp, kLinkDown, kIPv4Hook, kIPv6Hook, kGatewayHook}) {
      unlink(p.c_str());
    }
    unsetenv("VORN_FAKE_ENV");
  }
  std::unique_ptr<vorntest::DaemonProcess> daemon_;
};

TEST_F(LinkWatch, EachRealLinkChangeFiresOneEventAndRepeatsAreDropped) {
  std::string why;
  ASSERT_TRUE(vorntest::SetPeerLink("eth0", false, &why)) << why;
  auto down = WaitCalls(kLinkDown, 1);
  ASSERT_EQ(1u, down.size());
  EXPECT_EQ(std::vector<std::string>{"eth0"}, down[0].argv);

  // A link message with the same state (an MTU change) is no change.
  ASSERT_EQ(0, Ip({"link", "set", "eth0", "mtu", "1400"}));
  Settle();
  EXPECT_EQ(1u, FakeCallsTo(kLinkDown).size());
  EXPECT_TRUE(FakeCallsTo(kLinkUp).empty());

  ASSERT_TRUE(vorntest::SetPeerLink("eth0", true, &why)) << why;
  auto up = WaitCalls(kLinkUp, 1);
  ASSERT_EQ(1u, up.size());
  EXPECT_EQ(std::vector<std::string>{"eth0"}, up[0].argv);
  ASSERT_EQ(0, Ip({"link", "set", "eth0", "mtu", "1500"}));
  Settle();
  EXPECT_EQ(1u, FakeCallsTo(kLinkUp).size());
  EXPECT_EQ(1u, FakeCallsTo(kLinkDown).size());
}

TEST_F(LinkWatch, AddressChangesRunTheIpChangeHooks) {
  ASSERT_EQ(0, Ip({"addr", "add", "10.200.1.77/24", "dev", "eth0"}));
  auto v4 = WaitCalls(kIPv4Hook, 1);
  ASSERT_EQ(1u, v4.size());
  EXPECT_EQ(std::vector<std::string>{"5"}, v4[0].argv);
  EXPECT_EQ("eth0", v4[0].env["IFNAME"]);
  EXPECT_EQ("10.200.1.2", v4[0].env["ORIGIN_ADDRESS"]);
  EXPECT_EQ("10.200.1.77", v4[0].env["NEW_ADDRESS"]);
  EXPECT_EQ("-1", v4[0].env["PREFIX_LENGTH"]);
  EXPECT_EQ("true", v4[0].env["IS_LINK"]);
  ASSERT_EQ(0, Ip({"addr", "del", "10.200.1.77/24", "dev", "eth0"}));

  // An IPv6 address added, removed and added again: the second add is new again; the same
  // address reported twice is one hook.
  ASSERT_EQ(0, Ip({"-6", "addr", "add", "fd00:77::2/64", "dev", "eth1", "nodad"}));
  auto v6 = WaitCalls(kIPv6Hook, 1);
  ASSERT_GE(v6.size(), 1u);
  FakeCall first = v6.back();
  EXPECT_EQ("eth1", first.env["IFNAME"]);
  EXPECT_EQ("fd00:77::2", first.env["NEW_ADDRESS"]);
  EXPECT_EQ("64", first.env["PREFIX_LENGTH"]);
  std::size_t seen = v6.size();
  ASSERT_EQ(0, Ip({"-6", "addr", "change", "fd00:77::2/64", "dev", "eth1", "nodad",
                   "preferred_lft", "300", "valid_lft", "600"}));
  Settle();
  EXPECT_EQ(seen, FakeCallsTo(kIPv6Hook).size());
  ASSERT_EQ(0, Ip({"-6", "addr", "del", "fd00:77::2/64", "dev", "eth1"}));
}

TEST_F(LinkWatch, MainTableRouteChangesRunTheGatewayHook) {
  ASSERT_EQ(0, Ip({"route", "add", "10.55.0.0/16", "via", "10.200.1.1", "dev", "eth0"}));
  ASSERT_EQ(0, Ip({"route", "del", "10.55.0.0/16", "via", "10.200.1.1", "dev", "eth0"}));
  ASSERT_EQ(0, Ip({"route", "add", "10.56.0.0/16", "via", "10.200.1.1", "table", "100"}));
  auto calls = WaitCalls(kGatewayHook, 2);
  Settle();
  calls = FakeCallsTo(kGatewayHook);
  // Both changes of 10.55.0.0/16 in order; the table-100 route never appears.
  ASSERT_GE(calls.size(), 2u);
  EXPECT_EQ(std::vector<std::string>{"5"}, calls[0].argv);
  EXPECT_EQ("NEW", calls[0].env["ACTION"]);
  EXPECT_EQ("eth0", calls[0].env["IFNAME"]);
  EXPECT_EQ("10.55.0.0", calls[0].env["DESTINATION"]);
  EXPECT_EQ("10.200.1.1", calls[0].env["GATEWAY"]);
  EXPECT_EQ("DEL", calls[1].env["ACTION"]);
  EXPECT_EQ("10.55.0.0", calls[1].env["DESTINATION"]);
  for (auto c : calls) EXPECT_NE("10.56.0.0", c.env["DESTINATION"]);
  Ip({"route", "del", "10.56.0.0/16", "table", "100"});
}

}  // namespace
