// The gateway database end to end: the real vornnetd in a sandbox with two uplinks (veth eth0 and
// eth1, each wired to a peer host), driven with gdbus. What is checked is what the appliance sees:
// the bytes of the priority, database and resolver files, the kernel's default routes, and the
// argv of the platform's change hooks.
#include <gtest/gtest.h>
#include <json/json.h>
#include <signal.h>
#include <unistd.h>

#include <chrono>
#include <memory>
#include <regex>
#include <string>
#include <thread>
#include <vector>

#include "fixtures/fake_journal.h"
#include "support/daemon_process.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "vornwireless/dbus_net/net_client.h"
#include "vornwireless/utils/dbus_client.h"

namespace {

using vorntest::DaemonProcess;
using vorntest::ReadFile;
using vorntest::RunResult;

const std::string kDir = "/etc/iproute2/config/";
const std::string kV4Priority = kDir + "gateway_v4_priority";
const std::string kV6Priority = kDir + "gateway_v6_priority";
const std::string kDatabase = kDir + "gateway_database";
const std::string kResolv4 = kDir + "resolv4.conf";
const std::string kResolv6 = kDir + "resolv6.conf";
const std::string kGatewayHook = "/usr/vorn/libexec/platform/VORNNetGatewayConfigChangeHook";
const std::string kDnsHook = "/usr/vorn/libexec/platform/VORNNetDnsConfigChangeHook";

RunResult Call(const std::string& method, const std::string& json) {
  return vorntest::Run({"/usr/bin/gdbus", "call", "--session", "--dest", "com.vornlink.net",
                        "--object-path", "/", "--method", "com.vornlink.net." + method, json});
}

bool Ping() {
  RunResult r = vorntest::Run({"/usr/bin/gdbus", "call", "--session", "--dest", "com.vornlink.net",
                               "--object-path", "/", "--method", "org.freedesktop.DBus.Peer.Ping"});
  return r.status == 0;
}

// The default routes of a family, one per line, with the kernel's trailing blanks and the IPv6
// "metric 1024 pref medium" tail cut off.
std::string DefaultRoutes(bool v6 = false) {
  RunResult r = v6 ? vorntest::Ip({"-6", "route", "show", "default"}) : vorntest::Ip({"route", "show", "default"});
  std::string out = std::regex_replace(r.out, std::regex(" +(metric 1024 )?(pref medium)? *\n"),
                                       "\n");
  return out;
}

// One section of a priority file; section files keep their keys in sorted order.
std::string Entry(int index, const std::string& ifname, const std::string& gateway,
                  const std::string& dns, const std::string& cls, bool slave = false) {
  return "[" + std::to_string(index) + "]\n\tclass=" + cls + "\n\tdns=" + dns +
         "\n\tgateway=" + gateway + "\n\tifname=" + ifname + "\n\tslave=" +
         (slave ? "yes" : "no") + "\n";
}

std::string Add(const std::string& type, const std::string& ifname, int priority,
                const std::string& gateway, const std::string& dns, const std::string& cls) {
  return "{\"type\": \"" + type + "\", \"ifname\": \"" + ifname +
         "\", \"priority\": " + std::to_string(priority) + ", \"gateway\": \"" + gateway +
         "\", \"dns\": \"" + dns + "\", \"class\": \"" + cls + "\"}";
}

// "priority:ifname" of each entry of GetGatewayListData's reply, in the order given, read with
// our own client.
std::string ListOf(const std::string& type) {
  vornnetwork::dbus::NetClient client;
  Json::Value request, result;
  request["type"] = type;
  if (client.GetGatewayListData(request, result) < 0) return "error";
  std::string out;
  for (Json::Value const& e : result) {
    out += (out.empty() ? "" : " ") + std::to_string(e["priority"].asInt()) + ":" +
           e["ifname"].asString();
  }
  return out;
}

class Gateways : public testing::Test {
 protected:
  // The tests share one sandbox: each starts from no gateway files, no default route, both
  // cables in and no interfaces but the two uplinks.
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    vorntest::Ip({"route", "flush", "exact", "0.0.0.0/0"});
    vorntest::Ip({"-6", "route", "flush", "exact", "::/0"});
    for (const char* f : {"gateway_v4_priority", "gateway_v6_priority", "gateway_database",
                          "resolv4.conf", "resolv6.conf"}) {
      unlink((kDir + f).c_str());
    }
    unlink("/run/vornplatform/deleted_default_gateway");
    for (int i = 0; i < 11; ++i) vorntest::Ip({"link", "del", "up" + std::to_string(i)});
    vorntest::Ip({"-6", "addr", "flush", "dev", "eth0", "scope", "global"});
    vorntest::Ip({"-6", "addr", "flush", "dev", "eth1", "scope", "global"});
    std::string why;
    ASSERT_TRUE(vorntest::SetPeerLink("eth0", true, &why)) << why;
    ASSERT_TRUE(vorntest::SetPeerLink("eth1", true, &why)) << why;
    ASSERT_TRUE(vorntest::InstallFake(kGatewayHook));
    ASSERT_TRUE(vorntest::InstallFake(kDnsHook));
    vorntest::ClearFakeJournal();
    StartDaemon();
  }
  void TearDown() override {
    if (daemon_) {
      EXPECT_EQ(0, daemon_->Stop(SIGTERM));
    }
  }
  void StartDaemon() {
    daemon_ = std::make_unique<DaemonProcess>(std::vector<std::string>{VORNNETD},
                                              "com.vornlink.net");
    ASSERT_TRUE(daemon_->ready());
  }
  void Restart() {
    ASSERT_EQ(0, daemon_->Stop(SIGTERM));
    daemon_.reset();
    StartDaemon();
  }
  // eth0 then eth1, both "ethernet" with their peer as gateway and DNS server.
  void AddBoth() {
    ASSERT_EQ(0, Call("AddGatewayData", Add("GTYPE_V4", "eth0", -1, "10.200.1.1", "10.200.1.1",
                                            "ethernet")).status);
    ASSERT_EQ(0, Call("AddGatewayData", Add("GTYPE_V4", "eth1", -1, "10.200.2.1", "10.200.2.1",
                                            "ethernet")).status);
  }

  std::unique_ptr<DaemonProcess> daemon_;
};

TEST_F(Gateways, TwoUplinksWriteTheFilesAndTheDefaultRouteTakesTheFirst) {
  AddBoth();
  EXPECT_EQ(Entry(0, "eth0", "10.200.1.1", "10.200.1.1", "ethernet") +
                Entry(1, "eth1", "10.200.2.1", "10.200.2.1", "ethernet"),
            ReadFile(kV4Priority));
  EXPECT_EQ("[eth0]\n\tdns=10.200.1.1\n\tgateway=10.200.1.1\n"
            "[eth1]\n\tdns=10.200.2.1\n\tgateway=10.200.2.1\n",
            ReadFile(kDatabase));
  EXPECT_EQ("nameserver 10.200.1.1\nnameserver 10.200.2.1\n", ReadFile(kResolv4));
  EXPECT_EQ("default via 10.200.1.1 dev eth0 src 10.200.1.2\n", DefaultRoutes());
  EXPECT_EQ("0:eth0 1:eth1", ListOf("GTYPE_V4"));

  // Each first add changed the database, so both stages of both hooks ran once per interface.
  auto gw = vorntest::FakeCallsTo(kGatewayHook);
  ASSERT_EQ(4u, gw.size());
  EXPECT_EQ((std::vector<std::string>{"4", "ipv4", "eth0", "", "10.200.1.1"}), gw[0].argv);
  EXPECT_EQ((std::vector<std::string>{"5", "ipv4", "eth0", "", "10.200.1.1"}), gw[1].argv);
  EXPECT_EQ((std::vector<std::string>{"4", "ipv4", "eth1", "", "10.200.2.1"}), gw[2].argv);
  auto dns = vorntest::FakeCallsTo(kDnsHook);
  ASSERT_EQ(4u, dns.size());
  EXPECT_EQ((std::vector<std::string>{"4", "eth0", "10.200.1.1"}), dns[0].argv);
  EXPECT_EQ((std::vector<std::string>{"5", "eth0", "10.200.1.1"}), dns[1].argv);

  // The same add again changes nothing the hooks care about: no new hook call.
  vorntest::ClearFakeJournal();
  ASSERT_EQ(0, Call("AddGatewayData", Add("GTYPE_V4", "eth0", -2, "10.200.1.1", "10.200.1.1",
                                          "ethernet")).status);
  EXPECT_TRUE(vorntest::FakeCallsTo(kGatewayHook).empty());
  EXPECT_TRUE(vorntest::FakeCallsTo(kDnsHook).empty());
  EXPECT_EQ("0:eth0 1:eth1", ListOf("GTYPE_V4"));
}

TEST_F(Gateways, CarrierLostThenRefreshMovesTheDefaultRouteToTheSecondUplink) {
  AddBoth();
  ASSERT_EQ("default via 10.200.1.1 dev eth0 src 10.200.1.2\n", DefaultRoutes());
  std::string before = ReadFile(kV4Priority);

  std::string why;
  ASSERT_TRUE(vorntest::SetPeerLink("eth0", false, &why)) << why;
  ASSERT_EQ(0, Call("RefreshGateway", R"({"type": "ALL"})").status);
  EXPECT_EQ("default via 10.200.2.1 dev eth1 src 10.200.2.2\n", DefaultRoutes());
  EXPECT_EQ("0:eth1 1:eth0", ListOf("GTYPE_V4"));
  // The new order is in memory; the file follows at its next write.
  EXPECT_EQ(before, ReadFile(kV4Priority));
  ASSERT_EQ(0, Call("DelGatewayData", R"({"type": "GTYPE_V4", "ifname": "nosuch0"})").status);
  EXPECT_EQ(Entry(0, "eth1", "10.200.2.1", "10.200.2.1", "ethernet") +
                Entry(1, "eth0", "10.200.1.1", "10.200.1.1", "ethernet"),
            ReadFile(kV4Priority));

  // The cable comes back: the winner stays first.
  ASSERT_TRUE(vorntest::SetPeerLink("eth0", true, &why)) << why;
  ASSERT_EQ(0, Call("RefreshGateway", R"({"type": "GTYPE_V4"})").status);
  EXPECT_EQ("default via 10.200.2.1 dev eth1 src 10.200.2.2\n", DefaultRoutes());
  EXPECT_EQ("0:eth1 1:eth0", ListOf("GTYPE_V4"));
}

TEST_F(Gateways, AllCandidatesFailingRestoresTheSystemsGateway) {
  AddBoth();
  // The system's own gateway, set outside the module (no "src").
  ASSERT_EQ(0, vorntest::Ip({"route", "replace", "default", "via", "10.200.2.1"}).status);
  ASSERT_EQ("default via 10.200.2.1 dev eth1\n", DefaultRoutes());
  std::string why;
  ASSERT_TRUE(vorntest::SetPeerLink("eth0", false, &why)) << why;
  ASSERT_TRUE(vorntest::SetPeerLink("eth1", false, &why)) << why;
  ASSERT_EQ(0, Call("RefreshGateway", R"({"type": "GTYPE_V4"})").status);
  // Both candidates were skipped (no carrier); the system's route is back, on a link that is down.
  EXPECT_EQ("default via 10.200.2.1 dev eth1 linkdown\n", DefaultRoutes());
  EXPECT_EQ("0:eth0 1:eth1", ListOf("GTYPE_V4"));
}

TEST_F(Gateways, Ipv6RoutesFollowTheListAndTheUnspecifiedGatewayRoutesOverTheDevice) {
  ASSERT_EQ(0, vorntest::Ip({"-6", "addr", "add", "fd00:1::2/64", "dev", "eth0", "nodad"}).status);
  ASSERT_EQ(0, vorntest::Ip({"-6", "addr", "add", "fd00:2::2/64", "dev", "eth1", "nodad"}).status);
  ASSERT_EQ(0, Call("AddGatewayData", Add("GTYPE_V6", "eth0", -1, "fd00:1::1", "fd00:1::53",
                                          "wan")).status);
  ASSERT_EQ(0, Call("AddGatewayData", Add("GTYPE_V6", "eth1", -1, "::", "NULL", "wan")).status);
  EXPECT_EQ("default via fd00:1::1 dev eth0\n", DefaultRoutes(true));
  EXPECT_EQ(Entry(0, "eth0", "fd00:1::1", "fd00:1::53", "wan") + Entry(1, "eth1", "::", "", "wan"),
            ReadFile(kV6Priority));
  EXPECT_EQ("nameserver fd00:1::53\n", ReadFile(kResolv6));
  EXPECT_EQ("[eth0]\n\tdns_v6=fd00:1::53\n\tgateway_v6=fd00:1::1\n"
            "[eth1]\n\tdns_v6=\n\tgateway_v6=::\n",
            ReadFile(kDatabase));
  // The IPv4 list is untouched by IPv6 work.
  EXPECT_FALSE(vorntest::Exists(kV4Priority));

  // A second default route made by hand is swept away at the next refresh.
  ASSERT_EQ(0, vorntest::Ip({"-6", "route", "add", "default", "via", "fd00:2::1", "dev", "eth1",
                   "metric", "50"}).status);
  ASSERT_EQ(0, Call("DelGatewayData", R"({"type": "GTYPE_V6", "ifname": "eth0"})").status);
  EXPECT_EQ("default dev eth1\n", DefaultRoutes(true));
  EXPECT_EQ("0:eth1", ListOf("GTYPE_V6"));
  EXPECT_EQ("", ReadFile(kResolv6));
  // The database keeps the deleted interface's section.
  EXPECT_NE(std::string::npos, ReadFile(kDatabase).find("[eth0]"));
}

// Eleven or more stored entries come back in the string order of their section names, and those
// without link are dropped; the next write makes both final.
TEST_F(Gateways, RestartReadsStoredEntriesInSectionNameOrderAndDropsThoseWithoutLink) {
  ASSERT_EQ(0, daemon_->Stop(SIGTERM));
  daemon_.reset();
  // Ten more uplinks with link (veth pairs up at both ends), one without (its pair end down).
  for (int i = 0; i < 11; ++i) {
    std::string a = "up" + std::to_string(i), b = "upp" + std::to_string(i);
    ASSERT_EQ(0, vorntest::Ip({"link", "add", a, "type", "veth", "peer", "name", b}).status);
    ASSERT_EQ(0, vorntest::Ip({"link", "set", a, "up"}).status);
    if (i != 4) {
      ASSERT_EQ(0, vorntest::Ip({"link", "set", b, "up"}).status);
    }
  }
  std::string stored;
  for (int i = 0; i < 11; ++i) {
    stored += Entry(i, "up" + std::to_string(i), "10.9." + std::to_string(i) + ".1", "", "wan");
  }
  stored += Entry(11, "eth1", "10.200.2.1", "10.200.2.1", "wan");
  ASSERT_TRUE(vorntest::WriteFile(kV4Priority, stored));
  // Wait for the carriers (veth reports them asynchronously).
  for (int n = 0; n < 100 && ReadFile("/sys/class/net/up10/carrier") != "1\n"; ++n) {
    std::this_thread::sleep_for(std::chrono::milliseconds(20));
  }
  vorntest::SyslogCapture log;
  StartDaemon();
  EXPECT_EQ("0:up0 1:up1 2:up10 3:eth1 4:up2 5:up3 6:up5 7:up6 8:up7 9:up8 10:up9",
            ListOf("GTYPE_V4"));
  EXPECT_TRUE(log.HasOnce(LOG_INFO, vorntest::LogLine("network/route/route_module.cpp",
                                                      "Interface [up4] is not up, skip it")))
      << log.Dump();
  // Reading alone writes nothing; the next write renumbers.
  EXPECT_EQ(stored, ReadFile(kV4Priority));
  ASSERT_EQ(0, Call("DelGatewayData", R"({"type": "GTYPE_V4", "ifname": "up9"})").status);
  std::string expect;
  const char* order[] = {"up0", "up1", "up10", "eth1", "up2", "up3", "up5", "up6", "up7", "up8"};
  for (int i = 0; i < 10; ++i) {
    std::string name = order[i];
    if (name == "eth1") {
      expect += Entry(i, "eth1", "10.200.2.1", "10.200.2.1", "wan");
    } else {
      expect += Entry(i, name, "10.9." + name.substr(2) + ".1", "", "wan");
    }
  }
  EXPECT_EQ(expect, ReadFile(kV4Priority));
  Restart();
  EXPECT_EQ("0:up0 1:up1 2:up10 3:eth1 4:up2 5:up3 6:up5 7:up6 8:up7 9:up8", ListOf("GTYPE_V4"));
}

// The client wrappers that the other subsystems use (USB modem, Wi-Fi client, bridges, IPv6)
// against the real route module.
TEST_F(Gateways, ClientWrappersAddQueryRefreshAndDelete) {
  EXPECT_EQ(-1, vornwireless::utils::GetGatewayPriority("eth1", "GTYPE_V4"));
  EXPECT_TRUE(vornwireless::utils::SetGatewayInfo("eth1", "GTYPE_V4", "10.200.2.1", "NULL",
                                                  "wan", -1, true));
  EXPECT_TRUE(vornwireless::utils::SetGatewayInfo("eth0", "GTYPE_V4", "10.200.1.1", "10.200.1.1",
                                                  "wan", 0, true));
  EXPECT_EQ(0, vornwireless::utils::GetGatewayPriority("eth0", "GTYPE_V4"));
  EXPECT_EQ(1, vornwireless::utils::GetGatewayPriority("eth1", "GTYPE_V4"));
  EXPECT_EQ("nameserver 10.200.1.1\n", ReadFile(kResolv4));
  // eth1 was the first to come, so it got the default route; the later add of eth0 at index 0
  // refreshed it onto eth0.
  EXPECT_EQ("default via 10.200.1.1 dev eth0 src 10.200.1.2\n", DefaultRoutes());
  EXPECT_TRUE(vornwireless::utils::DelGatewayInfo("eth0", "GTYPE_V4", true));
  EXPECT_EQ("default via 10.200.2.1 dev eth1 src 10.200.2.2\n", DefaultRoutes());
  EXPECT_EQ(-1, vornwireless::utils::GetGatewayPriority("eth0", "GTYPE_V4"));
  EXPECT_EQ("", ReadFile(kResolv4));
  EXPECT_TRUE(vornwireless::utils::RefreshGateway("ALL"));
  EXPECT_EQ("default via 10.200.2.1 dev eth1 src 10.200.2.2\n", DefaultRoutes());
}

RunResult Tool(std::vector<std::string> args) {
  args.insert(args.begin(), VORNNETDTOOL);
  return vorntest::Run(args);
}

// The demo's story, told with vornnetdtool: two uplinks, the first cable pulled, a refresh.
TEST_F(Gateways, VornnetdtoolRegistersUplinksAndRefreshMovesTheRoute) {
  for (auto const& [ifname, peer] : {std::pair<std::string, std::string>{"eth0", "10.200.1.1"},
                                     {"eth1", "10.200.2.1"}}) {
    RunResult r = Tool({"gateway", "add", "--ifname", ifname, "--type", "v4", "--priority", "-1",
                        "--gateway", peer, "--dns", peer, "--class", "ethernet"});
    ASSERT_EQ(0, r.status) << r.err;
  }
  EXPECT_EQ("default via 10.200.1.1 dev eth0 src 10.200.1.2\n", DefaultRoutes());
  RunResult list = Tool({"gateway", "list"});
  ASSERT_EQ(0, list.status) << list.err;
  Json::Value parsed;
  ASSERT_TRUE(Json::Reader().parse(list.out, parsed)) << list.out;
  ASSERT_EQ(2u, parsed.size());
  EXPECT_EQ("eth0", parsed[0]["ifname"].asString());
  EXPECT_EQ(0, parsed[0]["priority"].asInt());
  EXPECT_EQ("10.200.1.1", parsed[0]["gateway"].asString());
  EXPECT_EQ("10.200.1.1", parsed[0]["dns"].asString());
  EXPECT_EQ("ethernet", parsed[0]["class"].asString());
  EXPECT_FALSE(parsed[0]["slave"].asBool());
  EXPECT_EQ("eth1", parsed[1]["ifname"].asString());

  // An add without --class keeps the stored class.
  ASSERT_EQ(0, Tool({"gateway", "add", "--ifname", "eth1", "--priority", "-2"}).status);
  RunResult get = Tool({"gateway", "get", "eth1"});
  ASSERT_EQ(0, get.status) << get.err;
  ASSERT_TRUE(Json::Reader().parse(get.out, parsed)) << get.out;
  EXPECT_EQ("ethernet", parsed["class"].asString());
  EXPECT_EQ("10.200.2.1", parsed["gateway"].asString());
  EXPECT_EQ(1, parsed["priority"].asInt());
  EXPECT_TRUE(parsed["exist"].asBool());

  std::string why;
  ASSERT_TRUE(vorntest::SetPeerLink("eth0", false, &why)) << why;
  RunResult refresh = Tool({"--refresh-gateway", "all"});
  EXPECT_EQ(0, refresh.status) << refresh.err;
  EXPECT_EQ("default via 10.200.2.1 dev eth1 src 10.200.2.2\n", DefaultRoutes());
  EXPECT_EQ("0:eth1 1:eth0", ListOf("GTYPE_V4"));
}

// Bad requests leave the lists and the files as they were and never harm the daemon.
TEST_F(Gateways, BadRequestsLeaveListsAndFilesAsTheyWere) {
  AddBoth();
  std::string priority = ReadFile(kV4Priority), database = ReadFile(kDatabase),
              resolv = ReadFile(kResolv4), routes = DefaultRoutes();
  const std::vector<std::pair<std::string, std::string>> bad = {
      {"AddGatewayData", R"({"type": 4, "ifname": "eth9", "priority": -1})"},
      {"AddGatewayData", R"({"type": "GTYPE_V5", "ifname": "eth9", "priority": -1})"},
      {"AddGatewayData", R"({"type": "GTYPE_V4", "ifname": ["eth9"], "priority": -1})"},
      {"AddGatewayData", R"({"type": "GTYPE_V4", "ifname": "eth9", "priority": "first"})"},
      {"AddGatewayData", R"({"type": "GTYPE_V4", "ifname": "eth9", "priority": -1, "gateway": 7})"},
      {"AddGatewayData", R"({"type": "GTYPE_V4", "ifname": "", "priority": -1})"},
      {"AddGatewayData", R"({"type": "GTYPE_V4", "ifname": "eth9\n[x]", "priority": -1})"},
      {"AddGatewayData", R"({"type": "GTYPE_V4", "ifname": "eth]9", "priority": -1})"},
      {"AddGatewayData", R"({"type": "GTYPE_V4", "ifname": "eth=9", "priority": -1})"},
      {"DelGatewayData", R"({"type": [], "ifname": "eth0"})"},
      {"SetSlaveData", R"({"type": "GTYPE_V4", "ifname": "eth0", "slave": "yes"})"},
      {"CopyGatewayData",
       R"({"type": "GTYPE_V4", "interface_source": "eth0", "interface_destination": {},
           "interface_source_delete": true})"},
      {"RefreshGateway", R"({"type": 0})"},
      {"GetGatewayDataByInterface", R"({"type": "GTYPE_V4", "ifname": 1})"},
      {"GetGatewayListData", R"({"type": null})"},
  };
  for (auto const& [method, json] : bad) {
    Call(method, json);
    ASSERT_TRUE(Ping()) << method << " " << json.substr(0, 200);
    EXPECT_EQ(priority, ReadFile(kV4Priority)) << json.substr(0, 200);
    EXPECT_EQ(database, ReadFile(kDatabase)) << json.substr(0, 200);
    EXPECT_EQ(resolv, ReadFile(kResolv4)) << json.substr(0, 200);
    EXPECT_EQ("0:eth0 1:eth1", ListOf("GTYPE_V4")) << json.substr(0, 200);
  }
  EXPECT_EQ(routes, DefaultRoutes());
  EXPECT_TRUE(daemon_->running());
}

}  // namespace
