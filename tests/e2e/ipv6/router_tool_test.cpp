// The IPv6 router commands of vornnetdtool with the real vornnetd: a 6in4 tunnel (recorded by
// sit-ip-wrapper in place of /sbin/ip, which makes a tun device for it) with its address and
// gateway entry, 6to4 refused on a private-only WAN, native mode starting or restarting the
// DHCPv6 client job, and prefixes split among LANs.
#include <gtest/gtest.h>
#include <signal.h>
#include <unistd.h>

#include <memory>

#include "fixtures/fake_journal.h"
#include "ipv6_e2e_support.h"
#include "support/daemon_process.h"
#include "support/test_util.h"

namespace {

using ipv6e2e::V6Gateways;
using vorntest::DaemonProcess;
using vorntest::RunResult;

const char kSitLog[] = "/run/vorn/sit-tunnel.log";
const char kRecords[] = "/etc/sysconfig/networking";
const char kIfcfgDir[] = "/etc/sysconfig/network-scripts";

RunResult Tool(std::vector<std::string> args) {
  args.insert(args.begin(), VORNNETDTOOL);
  return vorntest::Run(args);
}

class RouterToolTest : public testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    vorntest::Run({"/bin/rm", "-rf", kRecords, kIfcfgDir});
    vorntest::Run({"/bin/mkdir", "-p", kRecords, kIfcfgDir, "/run/vorn"});
    for (const char* f : {"gateway_v4_priority", "gateway_v6_priority", "gateway_database",
                          "resolv4.conf", "resolv6.conf"}) {
      unlink((std::string("/etc/iproute2/config/") + f).c_str());
    }
    unlink("/usr/sbin/ip");
    ASSERT_EQ(0, vorntest::Run({"/bin/cp", vorntest::SourceDir() + "/tests/e2e/ipv6/sit-ip-wrapper",
                                "/usr/sbin/ip"})
                     .status);
    unlink(kSitLog);
    vorntest::Ip({"tuntap", "del", "dev", "6in4-eth0", "mode", "tun"});
    vorntest::Ip({"addr", "del", "203.0.113.5/24", "dev", "eth0"});
    for (const char* p : {"/sbin/start", "/sbin/restart", "/sbin/stop",
                          "/usr/vorn/libexec/platform/VORNNetGatewayConfigChangeHook",
                          "/usr/vorn/libexec/platform/VORNNetDnsConfigChangeHook"}) {
      ASSERT_TRUE(vorntest::InstallFake(p));
    }
    unlink("/tmp/dhclient6-eth0-pd.pid");
    vorntest::ClearFakeJournal();
    daemon_ = std::make_unique<DaemonProcess>(std::vector<std::string>{VORNNETD},
                                              "com.vornlink.net");
    ASSERT_TRUE(daemon_->ready());
  }
  void TearDown() override {
    if (daemon_) {
      EXPECT_EQ(0, daemon_->Stop(SIGTERM));
    }
  }
  std::unique_ptr<DaemonProcess> daemon_;
};

TEST_F(RouterToolTest, SixInFourBringsUpTheTunnelWithItsAddressAndGatewayEntry) {
  vorntest::IpOk({"addr", "add", "203.0.113.5/24", "dev", "eth0"});
  RunResult r = Tool({"ipv6-router", "create", "6in4",
                      "{\"wan\": \"eth0\", \"prefix\": \"2001:db8:100::/48\", \"remote_addr_v4\": "
                      "\"198.51.100.1\", \"local_addr_v6\": \"2001:db8:ffff::2/64\", "
                      "\"is_default_gateway\": true}"});
  ASSERT_EQ(0, r.status) << r.err;
  EXPECT_EQ("tunnel add 6in4-eth0 mode sit remote 198.51.100.1 local 203.0.113.5 ttl 255\n",
            vorntest::ReadFile(kSitLog));
  EXPECT_NE(std::string::npos,
            vorntest::Ip({"-6", "addr", "show", "dev", "6in4-eth0"}).out.find(
                "inet6 2001:db8:ffff::2/64"));
  EXPECT_EQ("6in4-eth0=::", V6Gateways());
  EXPECT_EQ("IPV6ROUTER=yes\n",
            vorntest::ReadFile(std::string(kIfcfgDir) + "/ifcfg-eth0"));
  EXPECT_EQ(
      "[conf]\n\ttype=6in4\n\twan=eth0\n\tprefix=2001:db8:100::/48\n\tis_default_gateway=yes\n"
      "[addr]\n\tlocal_addr_v4=203.0.113.5\n\tremote_addr_v4=198.51.100.1\n"
      "\tlocal_addr_v6=2001:db8:ffff::2/64\n[lan]\n",
      vorntest::ReadFile(std::string(kRecords) + "/ipv6-eth0"));
  // The live gateway database decides the default-gateway flag when the record is read.
  r = Tool({"ipv6-router", "show", "eth0"});
  ASSERT_EQ(0, r.status) << r.err;
  Json::Value shown;
  ASSERT_TRUE(Json::Reader().parse(r.out, shown));
  EXPECT_TRUE(shown["is_default_gateway"].asBool());
  EXPECT_EQ("198.51.100.1", shown["config"]["remote_addr_v4"].asString());

  // Destroy: the tunnel, the gateway entry, the record and the router mark go.
  r = Tool({"ipv6-router", "destroy", "eth0"});
  ASSERT_EQ(0, r.status) << r.err;
  EXPECT_EQ(std::string::npos, vorntest::Ip({"link", "show"}).out.find("6in4-eth0"));
  EXPECT_EQ("", V6Gateways());
  EXPECT_FALSE(vorntest::Exists(std::string(kRecords) + "/ipv6-eth0"));
  EXPECT_EQ("IPV6ROUTER=no\n", vorntest::ReadFile(std::string(kIfcfgDir) + "/ifcfg-eth0"));
}

TEST_F(RouterToolTest, TheLiveGatewayDatabaseOutranksTheRecordsDefaultGatewayFlag) {
  vorntest::IpOk({"addr", "add", "203.0.113.5/24", "dev", "eth0"});
  // Another uplink holds the first place of the IPv6 list.
  RunResult r = Tool({"gateway", "add", "--ifname", "eth1", "--type", "v6", "--priority", "0",
                      "--gateway", "::", "--class", "ethernet"});
  ASSERT_EQ(0, r.status) << r.err;
  r = Tool({"ipv6-router", "create", "6in4",
            "{\"wan\": \"eth0\", \"prefix\": \"2001:db8:100::/48\", \"remote_addr_v4\": "
            "\"198.51.100.1\", \"local_addr_v6\": \"2001:db8:ffff::2/64\", "
            "\"is_default_gateway\": false}"});
  ASSERT_EQ(0, r.status) << r.err;
  ASSERT_EQ("eth1=:: 6in4-eth0=::", V6Gateways());
  // The record holds the key (which alone reads as true); the database places the tunnel second,
  // so it is not the default gateway.
  EXPECT_NE(std::string::npos, vorntest::ReadFile(std::string(kRecords) + "/ipv6-eth0")
                                   .find("\tis_default_gateway=no\n"));
  r = Tool({"ipv6-router", "show", "eth0"});
  ASSERT_EQ(0, r.status) << r.err;
  Json::Value shown;
  ASSERT_TRUE(Json::Reader().parse(r.out, shown));
  EXPECT_FALSE(shown["is_default_gateway"].asBool()) << r.out;
  // Once the tunnel leads the list, the same record reads as the default gateway.
  ASSERT_EQ(0, Tool({"gateway", "del", "--ifname", "eth1", "--type", "v6"}).status);
  r = Tool({"ipv6-router", "show", "eth0"});
  ASSERT_TRUE(Json::Reader().parse(r.out, shown));
  EXPECT_TRUE(shown["is_default_gateway"].asBool()) << r.out;
}

TEST_F(RouterToolTest, SixToFourOnAPrivateOnlyWanFailsWithCode3) {
  RunResult r = Tool({"ipv6-router", "create", "6to4", "{\"wan\": \"eth0\"}"});
  EXPECT_EQ(3, r.status);
  EXPECT_NE(std::string::npos, r.err.find("error 3")) << r.err;
  EXPECT_FALSE(vorntest::Exists(kSitLog));
  EXPECT_FALSE(vorntest::Exists(std::string(kRecords) + "/ipv6-eth0"));
}

TEST_F(RouterToolTest, BadTypesAndParametersFailWithCode2) {
  EXPECT_EQ(2, Tool({"ipv6-router", "create", "6rd", "{\"wan\": \"eth0\"}"}).status);
  EXPECT_EQ(2, Tool({"ipv6-router", "create", "6in4", "{\"wan\": \"eth0\"}"}).status);
  EXPECT_EQ(1, Tool({"ipv6-router", "create", "6in4", "{not json"}).status);
  EXPECT_EQ(0, Tool({"ipv6-router", "create", "off", "{\"wan\": \"eth0\"}"}).status);
  vorntest::IpOk({"link", "set", "eth1", "down"});
  EXPECT_EQ(2, Tool({"ipv6-router", "create", "native", "{\"wan\": \"eth1\"}"}).status);
  vorntest::IpOk({"link", "set", "eth1", "up"});
  EXPECT_EQ("", V6Gateways());
}

TEST_F(RouterToolTest, NativeStartsTheClientOrRestartsTheRecordedOne) {
  RunResult r = Tool({"ipv6-router", "create", "native", "{\"wan\": \"eth0\"}"});
  ASSERT_EQ(0, r.status) << r.err;
  std::vector<vorntest::FakeCall> start = vorntest::FakeCallsTo("/sbin/start");
  ASSERT_EQ(1u, start.size());
  EXPECT_EQ((std::vector<std::string>{"dhcp-client6", "IFACE=eth0", "ACTION=pd"}), start[0].argv);
  EXPECT_TRUE(vorntest::FakeCallsTo("/sbin/restart").empty());
  // The entry carries no gateway address ("NULL" is not one).
  EXPECT_EQ("eth0=", V6Gateways());

  // The recorded client runs: the same request restarts it.
  vorntest::DaemonProcess client({"/bin/sleep", "60"}, "");
  ASSERT_TRUE(vorntest::WriteFile("/tmp/dhclient6-eth0-pd.pid",
                                  std::to_string(client.pid()) + "\n"));
  vorntest::ClearFakeJournal();
  r = Tool({"ipv6-router", "create", "native", "{\"wan\": \"eth0\"}"});
  ASSERT_EQ(0, r.status) << r.err;
  ASSERT_EQ(1u, vorntest::FakeCallsTo("/sbin/restart").size());
  EXPECT_EQ((std::vector<std::string>{"dhcp-client6", "IFACE=eth0", "ACTION=pd"}),
            vorntest::FakeCallsTo("/sbin/restart")[0].argv);
  EXPECT_TRUE(vorntest::FakeCallsTo("/sbin/start").empty());

  r = Tool({"ipv6-router", "destroy", "eth0"});
  ASSERT_EQ(0, r.status) << r.err;
  EXPECT_EQ(1u, vorntest::FakeCallsTo("/sbin/stop").size());
  // A second destroy finds no record.
  EXPECT_NE(0, Tool({"ipv6-router", "destroy", "eth0"}).status);
}

TEST_F(RouterToolTest, PrefixesAreSplitAmongLans) {
  vorntest::IpOk({"addr", "add", "203.0.113.5/24", "dev", "eth0"});
  ASSERT_EQ(0, Tool({"ipv6-router", "create", "6to4", "{\"wan\": \"eth0\"}"}).status);
  RunResult r = Tool({"ipv6-prefix", "allocate", "2002:cb00:7105:1::", "lbr0"});
  ASSERT_EQ(0, r.status) << r.err;
  EXPECT_NE(0, Tool({"ipv6-prefix", "allocate", "2002:cb00:7105:1::", "lbr1"}).status);
  ASSERT_EQ(0, Tool({"ipv6-prefix", "allocate", "2002:cb00:7105::", "lbr1"}).status);
  EXPECT_NE(0, Tool({"ipv6-prefix", "allocate", "2002:cb00:7105:2::", "lbr2"}).status);
  r = Tool({"ipv6-prefix", "list"});
  ASSERT_EQ(0, r.status) << r.err;
  Json::Value list;
  ASSERT_TRUE(Json::Reader().parse(r.out, list));
  ASSERT_EQ(2u, list.size());
  EXPECT_EQ("2002:cb00:7105::", list[0]["prefix"].asString());
  EXPECT_EQ("lbr1", list[0]["lan"].asString());
  EXPECT_EQ("eth0", list[0]["wan"].asString());
  EXPECT_EQ("2002:cb00:7105:1::", list[1]["prefix"].asString());
  EXPECT_EQ("lbr0", list[1]["lan"].asString());
  EXPECT_EQ(0, Tool({"ipv6-prefix", "deallocate", "2002:cb00:7105:1::", "lbr0"}).status);
  EXPECT_EQ(0, Tool({"ipv6-prefix", "deallocate", "2001:db8::", "lbr9"}).status);
  EXPECT_EQ(0, Tool({"ipv6-prefix", "allocate", "2002:cb00:7105:1::", "lbr2"}).status);
}

TEST_F(RouterToolTest, ARecordWithANonNumericPrefixLengthIsReportedNotFatal) {
  ASSERT_TRUE(vorntest::WriteFile(std::string(kRecords) + "/ipv6-eth0",
                                  "[conf]\n\ttype=6in4\n\twan=eth0\n\tprefix=x/abc\n[addr]\n[lan]\n"));
  RunResult r = Tool({"ipv6-prefix", "list"});
  EXPECT_EQ(1, r.status);
  EXPECT_NE(std::string::npos, r.err.find("ipv6-prefix")) << r.err;
  EXPECT_EQ(1, Tool({"ipv6-prefix", "allocate", "x/abc", "lbr0"}).status);
}

}  // namespace
