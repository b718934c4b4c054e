// The router modes without the network daemon: the DHCPv6 client's job, the tunnel's commands
// up to the gateway entry (which needs vornnetd and so fails here), the ifcfg mark and Destroy.
// The sit tunnel is recorded by the wrapper in tests/e2e/ipv6 in place of /sbin/ip.
#include <gtest/gtest.h>
#include <unistd.h>

#include <memory>

#include "fixtures/fake_journal.h"
#include "ipv6router_test_support.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "vornwireless/ipv6router/6in4.h"
#include "vornwireless/ipv6router/dhcp_pd.h"

namespace {

using vorn::network::ipv6::router::DHCPPD;
using vorn::network::ipv6::router::Router6Attr;
using vorn::network::ipv6::router::Tunnel6in4;

const char kSitLog[] = "/run/vorn/sit-tunnel.log";

std::vector<std::string> Args(std::string const& program) {
  std::vector<vorntest::FakeCall> calls = vorntest::FakeCallsTo(program);
  if (calls.empty()) return {};
  return calls.back().argv;
}

class Router6ModesTest : public testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    ipv6routertest::CleanDirs();
    for (const char* p : {"/sbin/start", "/sbin/restart", "/sbin/stop"}) {
      ASSERT_TRUE(vorntest::InstallFake(p));
    }
    vorntest::ClearFakeJournal();
    unlink("/tmp/dhclient6-eth0-pd.pid");
    unlink(kSitLog);
    // The wrapper takes the place of /sbin/ip (= /usr/sbin/ip) for tunnel commands.
    unlink("/usr/sbin/ip");
    ASSERT_EQ(0, vorntest::Run({"/bin/cp", vorntest::SourceDir() + "/tests/e2e/ipv6/sit-ip-wrapper",
                                "/usr/sbin/ip"})
                     .status);
    vorntest::Ip({"tuntap", "del", "dev", "6in4-eth0", "mode", "tun"});
  }
};

TEST_F(Router6ModesTest, DhcpPdStartsTheClientJobWhenNoneRuns) {
  DHCPPD pd(Router6Attr("eth0", true));
  EXPECT_TRUE(pd.StartDHCPPD());
  EXPECT_EQ((std::vector<std::string>{"dhcp-client6", "IFACE=eth0", "ACTION=pd"}),
            Args("/sbin/start"));
  EXPECT_TRUE(vorntest::FakeCallsTo("/sbin/restart").empty());
}

TEST_F(Router6ModesTest, DhcpPdRestartsTheClientJobWhenTheRecordedClientRuns) {
  // A living process in the pid file: the client runs.
  ASSERT_TRUE(vorntest::WriteFile("/tmp/dhclient6-eth0-pd.pid", std::to_string(getpid()) + "\n"));
  DHCPPD pd(Router6Attr("eth0", true));
  EXPECT_TRUE(pd.StartDHCPPD());
  EXPECT_EQ((std::vector<std::string>{"dhcp-client6", "IFACE=eth0", "ACTION=pd"}),
            Args("/sbin/restart"));
  EXPECT_TRUE(vorntest::FakeCallsTo("/sbin/start").empty());
  // A stale pid file (no such process) starts it again.
  vorntest::ClearFakeJournal();
  ASSERT_TRUE(vorntest::WriteFile("/tmp/dhclient6-eth0-pd.pid", "999999\n"));
  EXPECT_TRUE(pd.StartDHCPPD());
  EXPECT_EQ(1u, vorntest::FakeCallsTo("/sbin/start").size());
}

TEST_F(Router6ModesTest, DhcpPdCreateStopsAtTheGatewayEntryWithoutTheDaemon) {
  vorntest::SyslogCapture log;
  DHCPPD pd(Router6Attr("eth0", false));
  EXPECT_FALSE(pd.Create());
  EXPECT_EQ(1u, vorntest::FakeCallsTo("/sbin/start").size());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, vorntest::LogLine("ipv6router/dhcp_pd.cpp",
                                                     "Failed to add gateway info on dev eth0")))
      << log.Dump();
  EXPECT_FALSE(vorntest::Exists(ipv6routertest::kRecordDir + "/ipv6-eth0"));
}

TEST_F(Router6ModesTest, DhcpPdDestroyStopsTheJobAndFailsWhenTheFileIsGone) {
  DHCPPD pd(Router6Attr("eth0", false));
  ASSERT_TRUE(vorntest::WriteFile(ipv6routertest::kIfcfgDir + "/ifcfg-eth0", "DEVICE=eth0\n"));
  EXPECT_FALSE(pd.Destroy());
  EXPECT_EQ((std::vector<std::string>{"dhcp-client6", "IFACE=eth0", "ACTION=pd"}),
            Args("/sbin/stop"));
  EXPECT_EQ("DEVICE=eth0\nIPV6ROUTER=no\n",
            vorntest::ReadFile(ipv6routertest::kIfcfgDir + "/ifcfg-eth0"));
  // With the file present Destroy removes it and succeeds.
  ASSERT_EQ(0, Router6Attr("eth0", false).SaveConfig());
  EXPECT_TRUE(pd.Destroy());
  EXPECT_FALSE(vorntest::Exists(ipv6routertest::kRecordDir + "/ipv6-eth0"));
}

TEST_F(Router6ModesTest, NativeRoutersAreNeverEqualTunnelsCompareTheirRecords) {
  DHCPPD a(Router6Attr("eth0", false)), b(Router6Attr("eth0", false));
  EXPECT_FALSE(a == b);
  EXPECT_TRUE(a != b);
  Router6Attr attr("6in4", "eth0", "2001:db8::/48", "203.0.113.5", "198.51.100.1",
                   "2001:db8::2/64", false);
  Tunnel6in4 t1(attr), t2(attr);
  EXPECT_TRUE(t1 == t2);
  attr.remote_addr_v4 = "198.51.100.2";
  Tunnel6in4 t3(attr);
  EXPECT_TRUE(t1 != t3);
}

TEST_F(Router6ModesTest, TunnelCreateRunsItsCommandsInOrderUpToTheGatewayEntry) {
  Tunnel6in4 tunnel(Router6Attr("6in4", "eth0", "2001:db8:100::/48", "203.0.113.5",
                                "198.51.100.1", "2001:db8:ffff::2/64", false));
  vorntest::SyslogCapture log;
  EXPECT_FALSE(tunnel.Create());
  EXPECT_EQ("tunnel add 6in4-eth0 mode sit remote 198.51.100.1 local 203.0.113.5 ttl 255\n",
            vorntest::ReadFile(kSitLog));
  vorntest::RunResult link = vorntest::Ip({"-6", "addr", "show", "dev", "6in4-eth0"});
  EXPECT_NE(std::string::npos, link.out.find("2001:db8:ffff::2/64")) << link.out;
  EXPECT_NE(std::string::npos, vorntest::Ip({"link", "show", "6in4-eth0"}).out.find(",UP"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, vorntest::LogLine("ipv6router/6in4.cpp",
                                                     "Failed to add gateway info on dev "
                                                     "6in4-eth0")))
      << log.Dump();
  // Nothing is undone, and a second Create fails at the tunnel that is there.
  log.Clear();
  EXPECT_FALSE(tunnel.Create());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, vorntest::LogLine("ipv6router/6in4.cpp",
                                                     "Failed to create tunnel device 6in4-eth0 "
                                                     "(203.0.113.5 -> 198.51.100.1)")))
      << log.Dump();
}

TEST_F(Router6ModesTest, TunnelCreateFailsAtOnceWhenThePppoeInterfaceIsGone) {
  Tunnel6in4 tunnel(Router6Attr("6in4", "pppoe", "2001:db8:100::/48", "203.0.113.5",
                                "198.51.100.1", "2001:db8:ffff::2/64", false));
  vorntest::SyslogCapture log;
  EXPECT_FALSE(tunnel.Create());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, vorntest::LogLine("ipv6router/6in4.cpp",
                                                     "Failed to get WAN, may caused by broken "
                                                     "PPPoE connection")))
      << log.Dump();
  EXPECT_FALSE(vorntest::Exists(kSitLog));
}

TEST_F(Router6ModesTest, TunnelDestroyOfAGoneTunnelOnlyWarnsAndFailsOnTheGatewayAndFile) {
  Tunnel6in4 tunnel(Router6Attr("6in4", "eth0", "2001:db8:100::/48", "203.0.113.5",
                                "198.51.100.1", "2001:db8:ffff::2/64", false));
  vorntest::SyslogCapture log;
  EXPECT_FALSE(tunnel.Destroy());
  EXPECT_EQ("tunnel del 6in4-eth0\n", vorntest::ReadFile(kSitLog));
  EXPECT_TRUE(log.HasOnce(LOG_WARNING, vorntest::LogLine("ipv6router/6in4.cpp",
                                                         "Unable to delete tunnel device "
                                                         "6in4-eth0")))
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_WARNING, vorntest::LogLine("ipv6router/6in4.cpp",
                                                         "Failed to del gateway info on dev "
                                                         "6in4-eth0")))
      << log.Dump();
}

TEST_F(Router6ModesTest, BaseValidationEnablesIpv6OnAPointToPointWan) {
  // A tun device stands for a PPP link.
  vorntest::IpOk({"tuntap", "add", "dev", "ppp0", "mode", "tun"});
  ASSERT_TRUE(vorntest::WriteFile("/proc/sys/net/ipv6/conf/ppp0/disable_ipv6", "1\n"));
  ASSERT_TRUE(vorntest::WriteFile("/proc/sys/net/ipv6/conf/all/forwarding", "0\n"));
  Tunnel6in4 tunnel(Router6Attr("6in4", "ppp0", "2001:db8::/48", "203.0.113.5", "198.51.100.1",
                                "2001:db8::2/64", false));
  EXPECT_TRUE(tunnel.ValidateAttr());
  EXPECT_EQ("0\n", vorntest::ReadFile("/proc/sys/net/ipv6/conf/ppp0/disable_ipv6"));
  EXPECT_EQ("1\n", vorntest::ReadFile("/proc/sys/net/ipv6/conf/all/forwarding"));
  // An Ethernet WAN is left as it is.
  ASSERT_TRUE(vorntest::WriteFile("/proc/sys/net/ipv6/conf/eth0/disable_ipv6", "1\n"));
  Tunnel6in4 eth(Router6Attr("6in4", "eth0", "2001:db8::/48", "203.0.113.5", "198.51.100.1",
                             "2001:db8::2/64", false));
  EXPECT_TRUE(eth.ValidateAttr());
  EXPECT_EQ("1\n", vorntest::ReadFile("/proc/sys/net/ipv6/conf/eth0/disable_ipv6"));
  vorntest::WriteFile("/proc/sys/net/ipv6/conf/eth0/disable_ipv6", "0\n");
  vorntest::Ip({"tuntap", "del", "dev", "ppp0", "mode", "tun"});
}

}  // namespace
