// The link watcher running for real (Initialize + Start) against the sandbox's kernel: veth,
// bridge and tap driven with /sbin/ip; observed through the link-event actions, the hooks, the
// processing flag and the log. Messages sent to the module's socket by the test serve as a
// barrier: once one of them has been handled, everything the kernel sent before it has been too.
#include "vornwireless/network/netlink/netlink_module.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <string>
#include <vector>

#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "unit/hook/hook_recorder.h"
#include "unit/network_netlink/netlink_test_support.h"

using vornnetwork::network::module::NetlinkModule;
using vorntest::HookRun;
using vorntest::LinkMessage;
using vorntest::LogLine;

namespace {

using namespace vorntest::netlink_constants;


void IpBatch(const std::string& commands) {
  auto r = vorntest::Run({"/usr/sbin/ip", "-batch", "-"}, commands);
  ASSERT_EQ(r.status, 0) << r.err;
}

void SetPeer(bool up) {
  std::string why;
  ASSERT_TRUE(vorntest::SetPeerLink("eth0", up, &why)) << why;
}


// Link events other than the barriers'.
std::vector<std::string> Events(const std::string& ifname = "") {
  std::vector<std::string> out;
  for (const std::string& e : vorntest::LinkEvents()) {
    if (e.find(" sync") != std::string::npos) continue;
    if (!ifname.empty() && e.find(" " + ifname + " ") == std::string::npos) continue;
    out.push_back(e);
  }
  return out;
}

std::vector<HookRun> Runs(const std::string& hook, const std::string& key = "",
                          const std::string& value = "") {
  std::vector<HookRun> out;
  for (const HookRun& r : vorntest::HookRuns()) {
    if (r.program.find("/" + hook + "/") == std::string::npos) continue;
    if (!key.empty() && r.env.count(key) && r.env.at(key) != value) continue;
    if (!key.empty() && !r.env.count(key)) continue;
    out.push_back(r);
  }
  return out;
}

class NetlinkKernelTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    vorntest::Run({"/bin/rm", "-rf", kScripts, "/usr/vorn/libexec/platform"});
    vorntest::RemoveHooks();
    vorntest::ClearHookRuns();
    vorntest::ClearLinkEvents();
    ASSERT_TRUE(vorntest::InstallRecordingHook("net/ipv4_change", "10-record"));
    ASSERT_TRUE(vorntest::InstallRecordingHook("net/ipv6_change", "10-record"));
    ASSERT_TRUE(vorntest::InstallRecordingHook("net/gateway_change", "10-record"));
    ASSERT_TRUE(vorntest::InstallLinkRecorders());
    // The kernel marks a link running a moment after its carrier: start from a settled eth0, so
    // that the present state the module reads is the one the kernel reports next.
    ASSERT_TRUE(vorntest::WaitFor(
        [] { return vorntest::ReadFile("/sys/class/net/eth0/operstate") == "up\n"; }));
    ASSERT_EQ(module.Initialize(), 0);
    ASSERT_EQ(module.Start(), 0);
    Sync();
  }
  void TearDown() override {
    module.Terminate();
    for (const char* name : {"eth1", "docker0", "tap0", "br0", "s1", "s2"}) {
      vorntest::Run({"/usr/sbin/ip", "link", "del", name});
    }
    SetPeer(true);
  }
  // Waits until the thread has handled a message sent now (and so everything queued before).
  void Sync() {
    const std::string name = "sync" + std::to_string(++syncCount);
    ASSERT_TRUE(vorntest::SendToSocket(module.GetNetlinkFd(), LinkMessage(name, 0).Bytes()));
    const std::string want = "down " + name + " flag=1";
    ASSERT_TRUE(vorntest::WaitFor([&] {
      auto all = vorntest::LinkEvents();
      return std::find(all.begin(), all.end(), want) != all.end();
    })) << "the polling thread did not handle " << name;
  }
  NetlinkModule module;
  int syncCount = 0;
};

TEST_F(NetlinkKernelTest, VethDownAndUpGiveOneEventPerRealChange) {
  SetPeer(false);
  ASSERT_TRUE(vorntest::WaitFor([&] { return Events("eth0").size() >= 1; }));
  SetPeer(true);
  ASSERT_TRUE(vorntest::WaitFor([&] { return Events("eth0").size() >= 2; }));
  // Same state again (an MTU change sends the link as it is): dropped.
  vorntest::IpOk({"link", "set", "eth0", "mtu", "1400"});
  vorntest::IpOk({"link", "set", "eth0", "mtu", "1500"});
  Sync();
  EXPECT_EQ(Events("eth0"),
            (std::vector<std::string>{"down eth0 flag=1", "up eth0 flag=1"}));
}

TEST_F(NetlinkKernelTest, TapAndBridgeSlaveAreRecordedNotReported) {
  vorntest::IpOk({"tuntap", "add", "tap0", "mode", "tap"});
  vorntest::IpOk({"link", "set", "tap0", "up"});
  vorntest::IpOk({"addr", "add", "10.77.0.1/24", "dev", "tap0"});
  // A bridge port that the ifcfg files call a slave.
  ASSERT_EQ(vorntest::Run({"/bin/mkdir", "-p", kScripts}).status, 0);
  ASSERT_TRUE(vorntest::WriteFile(std::string(kScripts) + "/ifcfg-eth1", "DEVICE=eth1\nBRIDGE=br0\nSLAVE=yes\n"));
  vorntest::IpOk({"link", "add", "br0", "type", "bridge"});
  vorntest::IpOk({"link", "add", "eth1", "type", "veth", "peer", "name", "eth1p"});
  vorntest::IpOk({"link", "set", "eth1", "master", "br0"});
  vorntest::IpOk({"link", "set", "eth1", "up"});
  vorntest::IpOk({"link", "set", "eth1p", "up"});
  ASSERT_TRUE(vorntest::WaitFor(
      [] { return vorntest::ReadFile("/sys/class/net/eth1/carrier") == "1\n"; }));
  Sync();
  // eth1's up state comes through the link watch of the kernel, at most a second late.
  module.Terminate();
  EXPECT_TRUE(Events("tap0").empty());
  EXPECT_TRUE(Events("eth1").empty());
  EXPECT_TRUE(Runs("net/ipv4_change", "IFNAME", "tap0").empty());
  EXPECT_TRUE(module.GetLinkMap().Has("tap0"));
  EXPECT_FALSE(module.GetLinkMap().Get("tap0"));  // no carrier without a reader
  EXPECT_TRUE(module.GetLinkMap().Has("eth1"));
  EXPECT_FALSE(module.GetIPv4Map().Has("tap0"));
}

TEST_F(NetlinkKernelTest, BridgeSlaveCarrierIsRecorded) {
  ASSERT_EQ(vorntest::Run({"/bin/mkdir", "-p", kScripts}).status, 0);
  ASSERT_TRUE(vorntest::WriteFile(std::string(kScripts) + "/ifcfg-eth1", "DEVICE=eth1\nSLAVE=yes\n"));
  vorntest::IpOk({"link", "add", "br0", "type", "bridge"});
  vorntest::IpOk({"link", "add", "eth1", "type", "veth", "peer", "name", "eth1p"});
  vorntest::IpOk({"link", "set", "eth1", "master", "br0"});
  vorntest::IpOk({"link", "set", "eth1p", "up"});
  vorntest::SyslogCapture log;
  vorntest::IpOk({"link", "set", "eth1", "up"});
  // The carrier reaches us through the kernel's link watch: wait for the slave's drop line.
  ASSERT_TRUE(vorntest::WaitFor([&] {
    return !log.Matching(LogLine(kFile, "Drop event by slave=[1], linkStatus=[0]")).empty() &&
           vorntest::ReadFile("/sys/class/net/eth1/operstate") == "up\n";
  }));
  Sync();
  module.Terminate();
  EXPECT_TRUE(Events("eth1").empty());
  EXPECT_TRUE(module.GetLinkMap().Get("eth1"));
}

TEST_F(NetlinkKernelTest, DockerNameRaisesAndLowersTheFlagOnly) {
  vorntest::FlagWatch watch;
  // The set-up's barrier lowers the flag a moment after its action ran: that is not this test's.
  ASSERT_TRUE(vorntest::WaitFor([] { return !vorntest::Exists(vorntest::kLinkFlag); }));
  watch.Events();
  vorntest::IpOk({"link", "add", "docker0", "type", "bridge"});
  Sync();
  // The barrier's own event raises the flag too: docker0's pair comes first. The barrier's
  // action is seen as it runs, the flag's removal a moment later.
  std::vector<std::string> flags;
  vorntest::WaitFor([&] {
    for (auto const& e : watch.Events()) flags.push_back(e);
    return flags.size() >= 4u;
  });
  ASSERT_GE(flags.size(), 4u);
  EXPECT_EQ(flags[0], "set");
  EXPECT_EQ(flags[1], "unset");
  EXPECT_TRUE(Events("docker0").empty());
  EXPECT_FALSE(vorntest::Exists(vorntest::kLinkFlag));
  vorntest::IpOk({"addr", "add", "172.17.0.1/16", "dev", "docker0"});
  Sync();
  EXPECT_TRUE(Runs("net/ipv4_change").empty());
}

TEST_F(NetlinkKernelTest, IPv4AddressChangeRunsTheHook) {
  vorntest::IpOk({"addr", "add", "10.200.1.9/24", "dev", "eth0"});
  Sync();
  auto runs = Runs("net/ipv4_change");
  ASSERT_EQ(runs.size(), 1u);
  EXPECT_EQ(runs[0].args, std::vector<std::string>{"5"});
  EXPECT_EQ(runs[0].env["IFNAME"], "eth0");
  EXPECT_EQ(runs[0].env["ORIGIN_ADDRESS"], "10.200.1.2");  // from the present state
  EXPECT_EQ(runs[0].env["NEW_ADDRESS"], "10.200.1.9");
  EXPECT_EQ(runs[0].env["PREFIX_LENGTH"], "-1");
  EXPECT_EQ(runs[0].env["IS_LINK"], "true");
  // Its removal is silent: the deleted address stays stored.
  vorntest::IpOk({"addr", "del", "10.200.1.9/24", "dev", "eth0"});
  Sync();
  EXPECT_EQ(Runs("net/ipv4_change").size(), 1u);
  vorntest::IpOk({"addr", "add", "10.200.1.9/24", "dev", "eth0"});
  Sync();
  EXPECT_EQ(Runs("net/ipv4_change").size(), 1u);
  vorntest::IpOk({"addr", "del", "10.200.1.9/24", "dev", "eth0"});
}

TEST_F(NetlinkKernelTest, IPv6AddressAddedTwiceRunsOneHook) {
  vorntest::IpOk({"-6", "addr", "add", "2001:db8:1::5/64", "dev", "eth0", "nodad"});
  // The same address again (new lifetimes): the kernel repeats RTM_NEWADDR.
  vorntest::IpOk({"-6", "addr", "change", "2001:db8:1::5/64", "dev", "eth0", "valid_lft", "600",
      "preferred_lft", "300"});
  // The kernel tells an IPv6 address from a work queue: the hook is awaited, then the barrier.
  ASSERT_TRUE(vorntest::WaitFor(
      [] { return !Runs("net/ipv6_change", "NEW_ADDRESS", "2001:db8:1::5").empty(); }));
  Sync();
  auto runs = Runs("net/ipv6_change", "NEW_ADDRESS", "2001:db8:1::5");
  ASSERT_EQ(runs.size(), 1u);
  EXPECT_EQ(runs[0].env["IFNAME"], "eth0");
  EXPECT_EQ(runs[0].env["PREFIX_LENGTH"], "64");
  vorntest::IpOk({"-6", "addr", "del", "2001:db8:1::5/64", "dev", "eth0"});
  vorntest::IpOk({"-6", "addr", "add", "2001:db8:1::5/64", "dev", "eth0", "nodad"});
  ASSERT_TRUE(vorntest::WaitFor(
      [] { return Runs("net/ipv6_change", "NEW_ADDRESS", "2001:db8:1::5").size() >= 2u; }));
  Sync();
  EXPECT_EQ(Runs("net/ipv6_change", "NEW_ADDRESS", "2001:db8:1::5").size(), 2u);
  vorntest::IpOk({"-6", "addr", "del", "2001:db8:1::5/64", "dev", "eth0"});
}

TEST_F(NetlinkKernelTest, MainTableRouteChangeRunsTheGatewayHook) {
  vorntest::IpOk({"route", "add", "10.50.0.0/16", "via", "10.200.1.1"});
  vorntest::IpOk({"route", "del", "10.50.0.0/16", "via", "10.200.1.1"});
  vorntest::IpOk({"route", "add", "10.51.0.0/16", "via", "10.200.1.1", "table", "100"});
  vorntest::IpOk({"route", "add", "default", "via", "10.200.1.1"});
  Sync();
  auto runs = Runs("net/gateway_change", "DESTINATION", "10.50.0.0");
  ASSERT_EQ(runs.size(), 2u);
  EXPECT_EQ(runs[0].args, std::vector<std::string>{"5"});
  EXPECT_EQ(runs[0].env["ACTION"], "NEW");
  EXPECT_EQ(runs[0].env["IFNAME"], "eth0");
  EXPECT_EQ(runs[0].env["GATEWAY"], "10.200.1.1");
  EXPECT_EQ(runs[1].env["ACTION"], "DEL");
  EXPECT_TRUE(Runs("net/gateway_change", "DESTINATION", "10.51.0.0").empty());  // table 100
  auto defaults = Runs("net/gateway_change", "DESTINATION", "0.0.0.0");
  ASSERT_EQ(defaults.size(), 1u);
  EXPECT_EQ(defaults[0].env["ACTION"], "NEW");
  EXPECT_EQ(defaults[0].env["GATEWAY"], "10.200.1.1");
  vorntest::IpOk({"route", "del", "default"});
  vorntest::IpOk({"route", "del", "10.51.0.0/16", "table", "100"});
}

// Sets the far end of a veth pair made here up or down and waits until the near end's state
// has settled (operstate follows the carrier through the kernel's link watch).
void SetPairPeer(const std::string& name, bool up) {
  vorntest::IpOk({"link", "set", name + "p", up ? "up" : "down"});
  const std::string want = up ? "up\n" : "lowerlayerdown\n";
  ASSERT_TRUE(vorntest::WaitFor(
      [&] { return vorntest::ReadFile("/sys/class/net/" + name + "/operstate") == want; }))
      << name << " operstate " << vorntest::ReadFile("/sys/class/net/" + name + "/operstate");
}

TEST_F(NetlinkKernelTest, OVSBondMembersDrivenByTheKernel) {
  ASSERT_EQ(vorntest::Run({"/bin/mkdir", "-p", kScripts}).status, 0);
  ASSERT_TRUE(vorntest::WriteFile(std::string(kScripts) + "/ifcfg-s1", "DEVICE=s1\nMASTER=ovs_bond0\nSLAVE=yes\n"));
  ASSERT_TRUE(vorntest::WriteFile(std::string(kScripts) + "/ifcfg-s2", "DEVICE=s2\nMASTER=ovs_bond0\nSLAVE=yes\n"));
  ASSERT_TRUE(vorntest::WriteFile(std::string(kScripts) + "/ifcfg-ovs_bond0", "DEVICE=ovs_bond0\nSLAVE_LIST=\"s1 s2\"\n"));
  vorntest::Run({"/bin/rm", "-f", "/tmp/ovs_bond_hook_flag_ovs_bond0"});
  for (const char* name : {"s1", "s2"}) {
    vorntest::IpOk({"link", "add", name, "type", "veth", "peer", "name", std::string(name) + "p"});
    vorntest::IpOk({"link", "set", name, "up"});
  }
  Sync();
  // No member has link: the bond's first report is "down".
  EXPECT_EQ(Events("ovs_bond0"), std::vector<std::string>{"down ovs_bond0 flag=1"});
  SetPairPeer("s1", true);
  Sync();
  EXPECT_EQ(Events("ovs_bond0"),
            (std::vector<std::string>{"down ovs_bond0 flag=1", "up ovs_bond0 flag=1"}));
  EXPECT_TRUE(vorntest::Exists("/tmp/ovs_bond_hook_flag_ovs_bond0"));
  SetPairPeer("s2", true);  // second member: nothing
  SetPairPeer("s1", false);  // first down: nothing
  Sync();
  EXPECT_EQ(Events("ovs_bond0").size(), 2u);
  SetPairPeer("s2", false);  // last down: the bond goes down
  Sync();
  EXPECT_EQ(Events("ovs_bond0"),
            (std::vector<std::string>{"down ovs_bond0 flag=1", "up ovs_bond0 flag=1",
                                      "down ovs_bond0 flag=1"}));
  EXPECT_FALSE(vorntest::Exists("/tmp/ovs_bond_hook_flag_ovs_bond0"));
  EXPECT_TRUE(Events("s1").empty());
  EXPECT_TRUE(Events("s2").empty());
  vorntest::IpOk({"link", "del", "s1"});
  vorntest::IpOk({"link", "del", "s2"});
}

TEST_F(NetlinkKernelTest, DellinkIsIgnoredAndADatagramIsWalkedWhole) {
  std::string datagram = LinkMessage("eth7", kUp, RTM_DELLINK).Bytes() +
                         LinkMessage("eth8", kUp).Bytes() +
                         LinkMessage("eth9", IFF_UP | IFF_RUNNING).Bytes() +  // passing state
                         LinkMessage("eth10", IFF_UP).Bytes();
  ASSERT_TRUE(vorntest::SendToSocket(module.GetNetlinkFd(), datagram));
  // A message whose length runs past the datagram ends the walk.
  std::string broken = LinkMessage("eth11", kUp).Bytes();
  std::string tail = LinkMessage("eth12", kUp).Bytes();
  const uint32_t tooLong = 4000;
  std::memcpy(&tail[0], &tooLong, sizeof tooLong);
  ASSERT_TRUE(vorntest::SendToSocket(module.GetNetlinkFd(), broken + tail));
  Sync();
  EXPECT_EQ(Events(), (std::vector<std::string>{"up eth8 flag=1", "down eth10 flag=1",
                                                "up eth11 flag=1"}));
  // A real interface going away: its last state is a link message, the removal is not looked at.
  vorntest::IpOk({"link", "add", "eth1", "type", "veth", "peer", "name", "eth1p"});
  Sync();
  vorntest::ClearLinkEvents();
  vorntest::IpOk({"link", "del", "eth1"});
  Sync();
  EXPECT_TRUE(Events("eth1").empty());
}

TEST_F(NetlinkKernelTest, MessageBurstIsConsumedInOrder) {
  vorntest::RemoveHooks();  // no hook: the burst is limited by the module alone
  std::string add, del;
  for (int i = 1; i <= 60; ++i) {
    add += "address add 10.9.0." + std::to_string(i) + "/32 dev eth0\n";
    add += "address add 2001:db8:9::" + std::to_string(i) + "/128 dev eth0 nodad\n";
  }
  for (int i = 1; i <= 30; ++i) del += "address del 2001:db8:9::" + std::to_string(i) + "/128 dev eth0\n";
  vorntest::SyslogCapture log;
  IpBatch(add);
  // The kernel tells an IPv6 address from a work queue, as it leaves the tentative state: the
  // removals follow once every addition was told.
  ASSERT_TRUE(vorntest::WaitFor([] {
    auto r = vorntest::Run({"/usr/sbin/ip", "-6", "addr", "show", "dev", "eth0"});
    return r.out.find("tentative") == std::string::npos;
  }));
  Sync();
  IpBatch(del);
  Sync();
  module.Terminate();
  EXPECT_TRUE(log.Matching("recvmsg ret").empty()) << log.Dump();
  EXPECT_EQ(module.GetIPv4Map().Get("eth0"), "10.9.0.60");
  std::vector<std::string> want;
  for (int i = 31; i <= 60; ++i) want.push_back("2001:db8:9::" + std::to_string(i));
  ASSERT_EQ(module.GetIPv6Map().count("eth0"), 1u);
  // eth0's link-local address may finish its duplicate check (and be told) meanwhile.
  std::vector<std::string> seen;
  for (auto const& ip : module.GetIPv6Map().at("eth0")) {
    if (ip.compare(0, 5, "fe80:") != 0) seen.push_back(ip);
  }
  EXPECT_EQ(seen, want);
  std::string cleanup;
  for (int i = 1; i <= 60; ++i) cleanup += "address del 10.9.0." + std::to_string(i) + "/32 dev eth0\n";
  for (int i = 31; i <= 60; ++i) cleanup += "address del 2001:db8:9::" + std::to_string(i) + "/128 dev eth0\n";
  IpBatch(cleanup);
}

TEST_F(NetlinkKernelTest, TerminateCancelsAWaitingThreadPromptly) {
  vorntest::SyslogCapture log;
  const auto start = std::chrono::steady_clock::now();
  EXPECT_EQ(module.Terminate(), 0);
  const auto took = std::chrono::steady_clock::now() - start;
  EXPECT_LT(took, std::chrono::seconds(1));
  EXPECT_EQ(module.GetNetlinkFd(), -1);
  EXPECT_EQ(module.GetState(), 1);
  EXPECT_TRUE(log.Matching("netlink thread|cancel").empty()) << log.Dump();
  // Started again, it watches again.
  ASSERT_EQ(module.Initialize(), 0);
  ASSERT_EQ(module.Start(), 0);
  Sync();
}

TEST_F(NetlinkKernelTest, TerminateLetsARunningHookFinish) {
  const std::string record = "/run/slow-hook.txt";
  vorntest::RemoveHooks();
  ASSERT_EQ(vorntest::Run({"/bin/mkdir", "-p", "/usr/vorn/etc/hooks/net/ipv4_change"}).status, 0);
  ASSERT_TRUE(vorntest::WriteFile("/usr/vorn/etc/hooks/net/ipv4_change/10-slow",
                                  "#!/bin/sh\necho begin >> " + record +
                                      "\nsleep 0.5\necho end >> " + record + "\n",
                                  0755));
  ASSERT_TRUE(vorntest::SendToSocket(
      module.GetNetlinkFd(),
      vorntest::AddrMessage(RTM_NEWADDR, AF_INET, "eth0", "10.200.1.33", 24).Bytes()));
  ASSERT_TRUE(vorntest::WaitFor([&] { return vorntest::ReadFile(record) == "begin\n"; }));
  vorntest::SyslogCapture log;
  EXPECT_EQ(module.Terminate(), 0);
  EXPECT_EQ(vorntest::ReadFile(record), "begin\nend\n");  // finished before the thread ended
  EXPECT_TRUE(log.Matching("netlink thread").empty()) << log.Dump();
  EXPECT_EQ(module.GetIPv4Map().Get("eth0"), "10.200.1.33");
}

}  // namespace
