// The route module driven directly with JSON requests, against the real kernel (veth eth0 and
// eth1 with peer hosts, wlan0 as a third uplink), the real /sbin/ip and ethtool, and recording
// fakes for the gateway and DNS hooks.
#include "vornwireless/network/route/route_module.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <functional>
#include <map>
#include <string>
#include <thread>
#include <vector>

#include "fixtures/fake_journal.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"

using vornnetwork::network::module::BaseModule;
using vornnetwork::network::module::GatewayInfo;
using vornnetwork::network::module::GTYPE_V4;
using vornnetwork::network::module::GTYPE_V6;
using vornnetwork::network::module::RouteModule;
using vorntest::FakeCallsTo;
using vorntest::LogLine;
using vorntest::ReadFile;
using vorntest::SyslogCapture;

namespace {

const char kV4File[] = "/etc/iproute2/config/gateway_v4_priority";
const char kV6File[] = "/etc/iproute2/config/gateway_v6_priority";
const char kDatabase[] = "/etc/iproute2/config/gateway_database";
const char kResolv4[] = "/etc/iproute2/config/resolv4.conf";
const char kResolv6[] = "/etc/iproute2/config/resolv6.conf";
const char kGatewayHook[] = "/usr/vorn/libexec/platform/VORNNetGatewayConfigChangeHook";
const char kDnsHook[] = "/usr/vorn/libexec/platform/VORNNetDnsConfigChangeHook";
const char kDnsUpdate[] = "/usr/vorn/libexec/platform/VORNNetDNSUpdate";
const char kHaRunning[] = "/usr/vorn/libexec/platform/VORNHAIsRunning";
const char kHeartbeat[] = "/usr/vorn/libexec/platform/VORNHAGetHeartbeatIF";
const char kSource[] = "network/route/route_module.cpp";

typedef std::vector<std::string> Args;

void PeerIp(std::string const& veth, Args args) {
  auto r = vorntest::PeerIp(veth, args);
  ASSERT_EQ(r.status, 0) << r.err;
}

std::string DefaultV4() { return vorntest::Ip({"route", "show", "default"}).out; }
std::string DefaultV6() { return vorntest::Ip({"-6", "route", "show", "default"}).out; }

Json::Value Request(std::string const& method, std::string const& type) {
  Json::Value r(Json::objectValue);
  r["method"] = method;
  r["type"] = type;
  return r;
}

Json::Value AddRequest(std::string const& type, std::string const& ifname, int priority,
                       std::string const& gateway = "NULL", std::string const& dns = "NULL",
                       std::string const& klass = "NULL") {
  Json::Value r = Request("ADD_GATEWAY_DATA", type);
  r["ifname"] = ifname;
  r["priority"] = priority;
  r["gateway"] = gateway;
  r["dns"] = dns;
  r["class"] = klass;
  return r;
}

Json::Value Call(RouteModule& m, Json::Value const& request) {
  Json::Value response;
  EXPECT_EQ(m.ProcessRequest(request, response), 0);
  return response;
}

std::vector<std::string> Names(RouteModule& m, vornnetwork::network::module::GATEWAY_TYPE t) {
  std::vector<std::string> names;
  for (GatewayInfo const& info : m.GetGatewayList(t)) names.push_back(info._ifname);
  return names;
}

// One section of a priority file as ConfigSection writes it (keys in sorted order).
std::string Entry(int index, std::string const& ifname, std::string const& gateway,
                  std::string const& dns, std::string const& klass, bool slave = false) {
  return "[" + std::to_string(index) + "]\n\tclass=" + klass + "\n\tdns=" + dns +
         "\n\tgateway=" + gateway + "\n\tifname=" + ifname + "\n\tslave=" + (slave ? "yes" : "no") +
         "\n";
}

std::vector<Args> Argvs(std::string const& program) {
  std::vector<Args> out;
  for (auto const& call : FakeCallsTo(program)) out.push_back(call.argv);
  return out;
}

class RouteModuleTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    vorntest::Run({"/bin/rm", "-rf", "/etc/iproute2/config", "/etc/vorninfo.conf",
                   "/run/vornplatform/deleted_default_gateway", kHaRunning, kHeartbeat});
    for (char const* veth : {"eth0", "eth1", "wlan0"}) {
      std::string why;
      ASSERT_TRUE(vorntest::SetPeerLink(veth, true, &why)) << why;
    }
    while (vorntest::Ip({"route", "del", "default"}).status == 0) {
    }
    while (vorntest::Ip({"-6", "route", "del", "default"}).status == 0) {
    }
    ASSERT_TRUE(vorntest::InstallFake(kGatewayHook));
    ASSERT_TRUE(vorntest::InstallFake(kDnsHook));
    ASSERT_TRUE(vorntest::InstallFake(kDnsUpdate));
    vorntest::WriteFakeReplies(Json::Value(Json::objectValue));
    vorntest::ClearFakeJournal();
  }
};

}  // namespace

TEST_F(RouteModuleTest, CreateGivesARouteModuleOfType3) {
  BaseModule* m = RouteModule::Create();
  ASSERT_NE(m, nullptr);
  EXPECT_EQ(m->GetType(), 3);
  EXPECT_NE(dynamic_cast<RouteModule*>(m), nullptr);
  EXPECT_EQ(m->StartModule(), 0);
  EXPECT_EQ(m->TerminateModule(), 0);
  delete m;
}

TEST_F(RouteModuleTest, TwoInterfacesWriteFilesByteForByteAndRouteViaTheFirst) {
  RouteModule m;
  ASSERT_EQ(m.InitialModule(), 0);
  Call(m, AddRequest("GTYPE_V4", "eth0", -1, "10.200.1.1", "8.8.8.8", "wan"));
  Call(m, AddRequest("GTYPE_V4", "eth1", -1, "10.200.2.1", "1.1.1.1", "wan"));

  EXPECT_EQ(ReadFile(kV4File), Entry(0, "eth0", "10.200.1.1", "8.8.8.8", "wan") +
                                   Entry(1, "eth1", "10.200.2.1", "1.1.1.1", "wan"));
  EXPECT_EQ(ReadFile(kDatabase),
            "[eth0]\n\tdns=8.8.8.8\n\tgateway=10.200.1.1\n"
            "[eth1]\n\tdns=1.1.1.1\n\tgateway=10.200.2.1\n");
  EXPECT_EQ(ReadFile(kResolv4), "nameserver 8.8.8.8\nnameserver 1.1.1.1\n");
  EXPECT_EQ(DefaultV4(), "default via 10.200.1.1 dev eth0 src 10.200.1.2 \n");
  EXPECT_FALSE(vorntest::Exists(kV6File));
}

TEST_F(RouteModuleTest, FirstAddWithEmptyDatabaseRunsStage4And5HooksOnlyOnRealChanges) {
  RouteModule m;
  Call(m, AddRequest("GTYPE_V4", "eth0", -1, "10.200.1.1", "8.8.8.8", "wan"));
  EXPECT_EQ(Argvs(kGatewayHook), (std::vector<Args>{{"4", "ipv4", "eth0", "", "10.200.1.1"},
                                                    {"5", "ipv4", "eth0", "", "10.200.1.1"}}));
  EXPECT_EQ(Argvs(kDnsHook),
            (std::vector<Args>{{"4", "eth0", "8.8.8.8"}, {"5", "eth0", "8.8.8.8"}}));

  // The same values again: nothing changed in the database, no hook.
  vorntest::ClearFakeJournal();
  Call(m, AddRequest("GTYPE_V4", "eth0", -2, "10.200.1.1", "8.8.8.8", "wan"));
  EXPECT_TRUE(FakeCallsTo(kGatewayHook).empty());
  EXPECT_TRUE(FakeCallsTo(kDnsHook).empty());

  // A new gateway only: the gateway hooks with old and new, no DNS hook.
  Call(m, AddRequest("GTYPE_V4", "eth0", -2, "10.200.1.9", "8.8.8.8"));
  EXPECT_EQ(Argvs(kGatewayHook),
            (std::vector<Args>{{"4", "ipv4", "eth0", "10.200.1.1", "10.200.1.9"},
                               {"5", "ipv4", "eth0", "10.200.1.1", "10.200.1.9"}}));
  EXPECT_TRUE(FakeCallsTo(kDnsHook).empty());

  // "NULL" members are not given: no hook.
  vorntest::ClearFakeJournal();
  Call(m, AddRequest("GTYPE_V4", "eth0", -2));
  EXPECT_TRUE(FakeCallsTo(kGatewayHook).empty());
  EXPECT_TRUE(FakeCallsTo(kDnsHook).empty());
}

TEST_F(RouteModuleTest, Ipv6HooksUseTheIpv6FamilyAndDatabaseKeys) {
  RouteModule m;
  Call(m, AddRequest("GTYPE_V4", "eth0", -1, "10.200.1.1", "8.8.8.8"));
  vorntest::ClearFakeJournal();
  Call(m, AddRequest("GTYPE_V6", "eth0", -1, "::", "2001:db8::53", "wan"));
  EXPECT_EQ(Argvs(kGatewayHook),
            (std::vector<Args>{{"4", "ipv6", "eth0", "", "::"}, {"5", "ipv6", "eth0", "", "::"}}));
  EXPECT_EQ(ReadFile(kDatabase),
            "[eth0]\n\tdns=8.8.8.8\n\tdns_v6=2001:db8::53\n\tgateway=10.200.1.1\n"
            "\tgateway_v6=::\n");
  EXPECT_EQ(ReadFile(kV6File), Entry(0, "eth0", "::", "2001:db8::53", "wan"));
  EXPECT_EQ(ReadFile(kResolv6), "nameserver 2001:db8::53\n");
}

TEST_F(RouteModuleTest, PriorityMinus2KeepsThePlaceAndLeavesTheResolverFileAlone) {
  RouteModule m;
  Call(m, AddRequest("GTYPE_V4", "eth0", -1, "10.200.1.1", "8.8.8.8"));
  Call(m, AddRequest("GTYPE_V4", "eth1", -1, "10.200.2.1", "1.1.1.1"));
  Call(m, AddRequest("GTYPE_V4", "ppp0", -1, "10.9.9.9", "9.9.9.9"));
  ASSERT_TRUE(vorntest::WriteFile(kResolv4, "marker\n"));
  Call(m, AddRequest("GTYPE_V4", "eth1", -2, "10.200.2.1", "1.1.1.1", "wan"));
  EXPECT_EQ(Names(m, GTYPE_V4), (std::vector<std::string>{"eth0", "eth1", "ppp0"}));
  EXPECT_EQ(ReadFile(kResolv4), "marker\n");
  // The same position given as a number does not rewrite it either.
  Call(m, AddRequest("GTYPE_V4", "eth1", 1, "10.200.2.1", "1.1.1.1"));
  EXPECT_EQ(ReadFile(kResolv4), "marker\n");
  // A new DNS does.
  Call(m, AddRequest("GTYPE_V4", "eth1", -2, "NULL", "1.0.0.1"));
  EXPECT_EQ(ReadFile(kResolv4), "nameserver 8.8.8.8\nnameserver 1.0.0.1\nnameserver 9.9.9.9\n");
  // -2 for a new interface appends.
  Call(m, AddRequest("GTYPE_V4", "ppp1", -2));
  EXPECT_EQ(Names(m, GTYPE_V4), (std::vector<std::string>{"eth0", "eth1", "ppp0", "ppp1"}));
}

TEST_F(RouteModuleTest, PriorityInRangeInsertsThereAndAnyOtherAppends) {
  RouteModule m;
  for (char const* name : {"a0", "a1", "a2"}) Call(m, AddRequest("GTYPE_V4", name, -1));
  EXPECT_EQ(Names(m, GTYPE_V4), (std::vector<std::string>{"a0", "a1", "a2"}));
  // The list size after removal (2) appends.
  Call(m, AddRequest("GTYPE_V4", "a0", 2));
  EXPECT_EQ(Names(m, GTYPE_V4), (std::vector<std::string>{"a1", "a2", "a0"}));
  // In range.
  Call(m, AddRequest("GTYPE_V4", "a0", 0));
  EXPECT_EQ(Names(m, GTYPE_V4), (std::vector<std::string>{"a0", "a1", "a2"}));
  Call(m, AddRequest("GTYPE_V4", "b0", 1));
  EXPECT_EQ(Names(m, GTYPE_V4), (std::vector<std::string>{"a0", "b0", "a1", "a2"}));
  // Above the size, -1 and other negative values append.
  Call(m, AddRequest("GTYPE_V4", "a0", 99));
  EXPECT_EQ(Names(m, GTYPE_V4), (std::vector<std::string>{"b0", "a1", "a2", "a0"}));
  Call(m, AddRequest("GTYPE_V4", "b0", -1));
  EXPECT_EQ(Names(m, GTYPE_V4), (std::vector<std::string>{"a1", "a2", "a0", "b0"}));
  Call(m, AddRequest("GTYPE_V4", "a1", -7));
  EXPECT_EQ(Names(m, GTYPE_V4), (std::vector<std::string>{"a2", "a0", "b0", "a1"}));
  Json::Value big = AddRequest("GTYPE_V4", "a2", 0);
  big["priority"] = Json::Value(Json::UInt64(1) << 40);
  Call(m, big);
  EXPECT_EQ(Names(m, GTYPE_V4), (std::vector<std::string>{"a0", "b0", "a1", "a2"}));
  EXPECT_EQ(ReadFile(kV4File),
            Entry(0, "a0", "", "", "unknown") + Entry(1, "b0", "", "", "unknown") +
                Entry(2, "a1", "", "", "unknown") + Entry(3, "a2", "", "", "unknown"));
}

TEST_F(RouteModuleTest, NullKeepsTheOldValues) {
  RouteModule m;
  Call(m, AddRequest("GTYPE_V4", "eth0", -1, "10.200.1.1", "8.8.8.8", "wan"));
  Call(m, AddRequest("GTYPE_V4", "eth0", -2, "NULL", "NULL", "NULL"));
  EXPECT_EQ(ReadFile(kV4File), Entry(0, "eth0", "10.200.1.1", "8.8.8.8", "wan"));
  Json::Value absent = Request("ADD_GATEWAY_DATA", "GTYPE_V4");
  absent["ifname"] = "eth0";
  absent["priority"] = -2;
  Call(m, absent);
  EXPECT_EQ(ReadFile(kV4File), Entry(0, "eth0", "10.200.1.1", "8.8.8.8", "wan"));
  Call(m, AddRequest("GTYPE_V4", "eth0", -2, "NULL", "9.9.9.9"));
  EXPECT_EQ(ReadFile(kV4File), Entry(0, "eth0", "10.200.1.1", "9.9.9.9", "wan"));
}

TEST_F(RouteModuleTest, AnInterfaceWithoutDnsWritesNoNameserverLine) {
  RouteModule m;
  Call(m, AddRequest("GTYPE_V4", "eth0", -1, "10.200.1.1"));
  Call(m, AddRequest("GTYPE_V4", "eth1", -1, "10.200.2.1", "1.1.1.1"));
  EXPECT_EQ(ReadFile(kResolv4), "nameserver 1.1.1.1\n");
}

TEST_F(RouteModuleTest, DnsUpdateRunsOnlyInAutomaticDnsMode) {
  RouteModule m;
  Call(m, AddRequest("GTYPE_V4", "eth0", -1, "10.200.1.1", "8.8.8.8"));
  EXPECT_TRUE(FakeCallsTo(kDnsUpdate).empty());
  ASSERT_TRUE(vorntest::WriteFile("/etc/vorninfo.conf", "dns_mode=\"auto\"\n"));
  Call(m, AddRequest("GTYPE_V4", "eth1", -1, "10.200.2.1", "1.1.1.1"));
  ASSERT_EQ(FakeCallsTo(kDnsUpdate).size(), 1u);
  EXPECT_TRUE(FakeCallsTo(kDnsUpdate)[0].argv.empty());
  ASSERT_TRUE(vorntest::WriteFile("/etc/vorninfo.conf", "dns_mode=\"manual\"\n"));
  Call(m, AddRequest("GTYPE_V4", "eth1", 0));
  EXPECT_EQ(FakeCallsTo(kDnsUpdate).size(), 1u);
  EXPECT_EQ(ReadFile(kResolv4), "nameserver 1.1.1.1\nnameserver 8.8.8.8\n");
}

TEST_F(RouteModuleTest, CarrierLostMovesTheDefaultRouteAndTheEntryToIndex0) {
  RouteModule m;
  Call(m, AddRequest("GTYPE_V4", "eth0", -1, "10.200.1.1", "8.8.8.8", "ethernet"));
  Call(m, AddRequest("GTYPE_V4", "eth1", -1, "10.200.2.1", "1.1.1.1", "ethernet"));
  EXPECT_EQ(DefaultV4(), "default via 10.200.1.1 dev eth0 src 10.200.1.2 \n");

  std::string why;
  ASSERT_TRUE(vorntest::SetPeerLink("eth0", false, &why)) << why;
  Call(m, Request("REFRESH_GATEWAY", "GTYPE_V4"));
  EXPECT_EQ(DefaultV4(), "default via 10.200.2.1 dev eth1 src 10.200.2.2 \n");
  EXPECT_EQ(Names(m, GTYPE_V4), (std::vector<std::string>{"eth1", "eth0"}));
  Json::Value list = Call(m, Request("GET_GATEWAY_LIST_DATA", "GTYPE_V4"));
  ASSERT_EQ(list.size(), 2u);
  EXPECT_EQ(list[0]["ifname"].asString(), "eth1");
  EXPECT_EQ(list[0]["priority"].asInt(), 0);
  // The file follows at the next write.
  EXPECT_EQ(ReadFile(kV4File), Entry(0, "eth0", "10.200.1.1", "8.8.8.8", "ethernet") +
                                   Entry(1, "eth1", "10.200.2.1", "1.1.1.1", "ethernet"));
  Call(m, AddRequest("GTYPE_V4", "ppp0", -1));
  EXPECT_EQ(ReadFile(kV4File), Entry(0, "eth1", "10.200.2.1", "1.1.1.1", "ethernet") +
                                   Entry(1, "eth0", "10.200.1.1", "8.8.8.8", "ethernet") +
                                   Entry(2, "ppp0", "", "", "unknown"));
  // The winner stays first when eth0 comes back.
  ASSERT_TRUE(vorntest::SetPeerLink("eth0", true, &why)) << why;
  Call(m, Request("REFRESH_GATEWAY", "ALL"));
  EXPECT_EQ(DefaultV4(), "default via 10.200.2.1 dev eth1 src 10.200.2.2 \n");
}

TEST_F(RouteModuleTest, AllCandidatesFailingRestoresTheSavedSystemGateway) {
  RouteModule m;
  Call(m, AddRequest("GTYPE_V4", "eth0", -1, "10.9.9.9", "NULL", "wan"));
  Call(m, AddRequest("GTYPE_V4", "eth1", -1, "10.8.8.8", "NULL", "wan"));
  vorntest::IpOk({"route", "add", "default", "via", "10.200.1.1"});
  Call(m, Request("REFRESH_GATEWAY", "GTYPE_V4"));
  EXPECT_EQ(DefaultV4().rfind("default via 10.200.1.1 dev eth0", 0), 0u) << DefaultV4();
  EXPECT_EQ(Names(m, GTYPE_V4), (std::vector<std::string>{"eth0", "eth1"}));
}

TEST_F(RouteModuleTest, ASlaveAtIndex0IsPassedOver) {
  RouteModule m;
  Call(m, AddRequest("GTYPE_V4", "eth0", -1, "10.200.1.1", "8.8.8.8", "wan"));
  Call(m, AddRequest("GTYPE_V4", "eth1", -1, "10.200.2.1", "1.1.1.1", "wan"));
  Json::Value slave = Request("SET_SLAVE_DATA", "GTYPE_V4");
  slave["ifname"] = "eth0";
  slave["slave"] = true;
  Call(m, slave);
  // Set slave moves it to the end and writes the list and the resolver file.
  EXPECT_EQ(ReadFile(kV4File), Entry(0, "eth1", "10.200.2.1", "1.1.1.1", "wan") +
                                   Entry(1, "eth0", "10.200.1.1", "8.8.8.8", "wan", true));
  EXPECT_EQ(ReadFile(kResolv4), "nameserver 1.1.1.1\nnameserver 8.8.8.8\n");
  // Back to index 0 (the whole old record, slave flag included, is kept). The add refreshes the
  // route: the slave at index 0 is passed over and eth1 moves to the front.
  vorntest::IpOk({"route", "del", "default"});
  Call(m, AddRequest("GTYPE_V4", "eth0", 0));
  EXPECT_EQ(DefaultV4(), "default via 10.200.2.1 dev eth1 src 10.200.2.2 \n");
  EXPECT_EQ(Names(m, GTYPE_V4), (std::vector<std::string>{"eth1", "eth0"}));
  EXPECT_TRUE(m.GetGatewayList(GTYPE_V4)[1]._slave);
  // Clearing the flag leaves the entry where it is; the route is not refreshed here.
  slave["slave"] = false;
  Call(m, slave);
  EXPECT_EQ(ReadFile(kV4File), Entry(0, "eth1", "10.200.2.1", "1.1.1.1", "wan") +
                                   Entry(1, "eth0", "10.200.1.1", "8.8.8.8", "wan"));
  EXPECT_EQ(DefaultV4(), "default via 10.200.2.1 dev eth1 src 10.200.2.2 \n");
  // An unknown interface writes nothing.
  ASSERT_TRUE(vorntest::WriteFile(kV4File, "marker\n"));
  slave["ifname"] = "eth9";
  Call(m, slave);
  EXPECT_EQ(ReadFile(kV4File), "marker\n");
}

TEST_F(RouteModuleTest, AWlanEntryOfClassEthernetIsNotAskedForItsLink) {
  RouteModule m;
  // Both without carrier: ethtool would say "no" for either.
  std::string why;
  ASSERT_TRUE(vorntest::SetPeerLink("eth0", false, &why)) << why;
  ASSERT_TRUE(vorntest::SetPeerLink("wlan0", false, &why)) << why;
  Call(m, AddRequest("GTYPE_V4", "eth0", -1, "10.200.1.1", "NULL", "ethernet"));
  Call(m, AddRequest("GTYPE_V4", "wlan0", -1, "10.200.3.1", "NULL", "ethernet"));
  EXPECT_EQ(DefaultV4().rfind("default via 10.200.3.1 dev wlan0 src 10.200.3.2", 0), 0u)
      << DefaultV4();
  EXPECT_EQ(Names(m, GTYPE_V4), (std::vector<std::string>{"wlan0", "eth0"}));
}

TEST_F(RouteModuleTest, Ipv6RoutesAreDeletedAndReaddedPerTheList) {
  vorntest::IpOk({"-6", "addr", "replace", "2001:db8:1::2/64", "dev", "eth0", "nodad"});
  vorntest::IpOk({"-6", "addr", "replace", "2001:db8:2::2/64", "dev", "eth1", "nodad"});
  PeerIp("eth0", {"-6", "addr", "replace", "2001:db8:1::1/64", "dev", "eth0", "nodad"});
  PeerIp("eth1", {"-6", "addr", "replace", "2001:db8:2::1/64", "dev", "eth1", "nodad"});

  RouteModule m;
  // An empty list leaves the present routes.
  vorntest::IpOk({"-6", "route", "add", "default", "via", "2001:db8:1::1", "dev", "eth0", "metric", "100"});
  vorntest::IpOk({"-6", "route", "add", "default", "via", "2001:db8:2::1", "dev", "eth1", "metric", "256"});
  std::string const present =
      "default via 2001:db8:1::1 dev eth0 metric 100 pref medium\n"
      "default via 2001:db8:2::1 dev eth1 metric 256 pref medium\n";
  Call(m, Request("REFRESH_GATEWAY", "GTYPE_V6"));
  EXPECT_EQ(DefaultV6(), present);

  // Both present routes are deleted; a failing candidate leaves no route (no fallback).
  Call(m, AddRequest("GTYPE_V6", "eth1", -1, "2001:db8:99::1", "2001:db8::53", "wan"));
  EXPECT_EQ(DefaultV6(), "");
  // A failing candidate is passed over; the winner moves to the front.
  Call(m, AddRequest("GTYPE_V6", "eth0", -1, "2001:db8:1::1", "NULL", "wan"));
  EXPECT_EQ(DefaultV6(), "default via 2001:db8:1::1 dev eth0 metric 1024 pref medium\n");
  EXPECT_EQ(Names(m, GTYPE_V6), (std::vector<std::string>{"eth0", "eth1"}));
  EXPECT_EQ(ReadFile(kV6File), Entry(0, "eth1", "2001:db8:99::1", "2001:db8::53", "wan") +
                                   Entry(1, "eth0", "2001:db8:1::1", "", "wan"));

  Call(m, AddRequest("GTYPE_V6", "eth1", 0, "2001:db8:2::1"));
  EXPECT_EQ(DefaultV6(), "default via 2001:db8:2::1 dev eth1 metric 1024 pref medium\n");
  EXPECT_EQ(Names(m, GTYPE_V6), (std::vector<std::string>{"eth1", "eth0"}));

  // "::" is a route over the device alone.
  Call(m, AddRequest("GTYPE_V6", "eth0", 0, "::"));
  EXPECT_EQ(DefaultV6(), "default dev eth0 metric 1024 pref medium\n");
  EXPECT_EQ(Names(m, GTYPE_V6), (std::vector<std::string>{"eth0", "eth1"}));
  // The IPv4 route is not touched by IPv6 requests.
  EXPECT_EQ(DefaultV4(), "");

  vorntest::IpOk({"-6", "addr", "del", "2001:db8:1::2/64", "dev", "eth0"});
  vorntest::IpOk({"-6", "addr", "del", "2001:db8:2::2/64", "dev", "eth1"});
}

TEST_F(RouteModuleTest, ElevenStoredEntriesComeBackInStringOrderWithoutTheLinklessOnes) {
  std::vector<std::string> names;
  for (int i = 0; i < 6; ++i) {
    std::string a = "ra" + std::to_string(i);
    std::string b = "rb" + std::to_string(i);
    vorntest::IpOk({"link", "add", a, "type", "veth", "peer", "name", b});
    vorntest::IpOk({"link", "set", a, "up"});
    vorntest::IpOk({"link", "set", b, "up"});
    names.push_back(a);
    names.push_back(b);
  }
  // rdown is up but its peer is not: no carrier.
  vorntest::IpOk({"link", "add", "rdown", "type", "veth", "peer", "name", "rdpeer"});
  vorntest::IpOk({"link", "set", "rdown", "up"});
  usleep(300000);
  // Sections "0".."10" name ra0, rb0, ra1, ... in index order; "11" is an interface that is
  // gone, "12" one without link.
  auto entry = [&](int section, std::string const& name) {
    return Entry(section, name, "10.0." + std::to_string(section) + ".1", "", "wan");
  };
  std::string file;
  for (int i = 0; i <= 10; ++i) file += entry(i, names[i]);
  file += entry(11, "gone0") + entry(12, "rdown");
  vorntest::Run({"/bin/mkdir", "-p", "/etc/iproute2/config"});
  ASSERT_TRUE(vorntest::WriteFile(kV4File, file));

  SyslogCapture log;
  RouteModule m;
  ASSERT_EQ(m.InitialModule(), 0);
  // String order of the sections: "0", "1", "10", "11", "12", "2", ... "9".
  std::vector<int> const order = {0, 1, 10, 2, 3, 4, 5, 6, 7, 8, 9};
  std::vector<std::string> expected;
  for (int i : order) expected.push_back(names[i]);
  EXPECT_EQ(Names(m, GTYPE_V4), expected);
  EXPECT_TRUE(log.HasOnce(LOG_INFO, LogLine(kSource, "Interface [gone0] is not up, skip it")))
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_INFO, LogLine(kSource, "Interface [rdown] is not up, skip it")))
      << log.Dump();
  // The static table's lookup rule is rebuilt, once per family.
  auto rules = vorntest::Ip({"rule", "show"}).out;
  EXPECT_NE(rules.find("2:\tfrom all lookup static-table"), std::string::npos) << rules;
  auto rules6 = vorntest::Ip({"-6", "rule", "show"}).out;
  EXPECT_NE(rules6.find("2:\tfrom all lookup static-table"), std::string::npos) << rules6;
  // No route is touched at start.
  EXPECT_EQ(DefaultV4(), "");
  // The next write keeps the order read and removes the others for good.
  Call(m, AddRequest("GTYPE_V4", names[0], -2));
  // The file itself holds its sections in string order again ("0", "1", "10", "2", ...).
  std::map<std::string, std::string> sections;
  for (size_t i = 0; i < order.size(); ++i) {
    sections[std::to_string(i)] = Entry(static_cast<int>(i), names[order[i]],
                                        "10.0." + std::to_string(order[i]) + ".1", "", "wan");
  }
  std::string written;
  for (auto const& section : sections) written += section.second;
  EXPECT_EQ(ReadFile(kV4File), written);
  for (int i = 0; i < 6; ++i) vorntest::Ip({"link", "del", "ra" + std::to_string(i)});
  vorntest::Ip({"link", "del", "rdown"});
}

TEST_F(RouteModuleTest, ARestartedModuleReadsTheFilesBack) {
  {
    RouteModule m;
    Call(m, AddRequest("GTYPE_V4", "eth0", -1, "10.200.1.1", "8.8.8.8", "wan"));
    Call(m, AddRequest("GTYPE_V4", "eth1", -1, "10.200.2.1", "1.1.1.1", "lan"));
    Call(m, AddRequest("GTYPE_V6", "eth1", -1, "::", "NULL", "wan"));
    Json::Value slave = Request("SET_SLAVE_DATA", "GTYPE_V4");
    slave["ifname"] = "eth0";
    slave["slave"] = true;
    Call(m, slave);
  }
  RouteModule m;
  ASSERT_EQ(m.InitialModule(), 0);
  Json::Value list = Call(m, Request("GET_GATEWAY_LIST_DATA", "GTYPE_V4"));
  Json::Value expected(Json::arrayValue);
  Json::Value e(Json::objectValue);
  e["priority"] = 0;
  e["ifname"] = "eth1";
  e["gateway"] = "10.200.2.1";
  e["dns"] = "1.1.1.1";
  e["slave"] = false;
  e["class"] = "lan";
  expected.append(e);
  e["priority"] = 1;
  e["ifname"] = "eth0";
  e["gateway"] = "10.200.1.1";
  e["dns"] = "8.8.8.8";
  e["slave"] = true;
  e["class"] = "wan";
  expected.append(e);
  EXPECT_EQ(list, expected) << list.toStyledString();
  EXPECT_EQ(Names(m, GTYPE_V6), (std::vector<std::string>{"eth1"}));
}

TEST_F(RouteModuleTest, GetByInterfaceAnswersTheEntryOrTheDefaults) {
  RouteModule m;
  Call(m, AddRequest("GTYPE_V4", "eth0", -1, "10.200.1.1", "8.8.8.8", "wan"));
  Call(m, AddRequest("GTYPE_V4", "eth1", -1, "10.200.2.1"));
  Json::Value q = Request("GET_GATEWAY_DATA_BY_INTERFACE", "GTYPE_V4");
  q["ifname"] = "eth1";
  Json::Value r = Call(m, q);
  EXPECT_EQ(r["priority"], 1);
  EXPECT_EQ(r["gateway"], "10.200.2.1");
  EXPECT_EQ(r["dns"], "");
  EXPECT_EQ(r["slave"], false);
  EXPECT_EQ(r["class"], "unknown");
  EXPECT_EQ(r["exist"], true);
  EXPECT_EQ(r.size(), 6u);
  q["type"] = "GTYPE_V6";
  r = Call(m, q);
  EXPECT_EQ(r["priority"], -1);
  EXPECT_EQ(r["gateway"], "");
  EXPECT_EQ(r["class"], "unknown");
  EXPECT_EQ(r["exist"], false);
}

TEST_F(RouteModuleTest, TheHeartbeatInterfaceIsLeftOutAndItsIndexStillCounts) {
  RouteModule m;
  Call(m, AddRequest("GTYPE_V4", "eth0", -1, "10.200.1.1"));
  Call(m, AddRequest("GTYPE_V4", "mon.hb0", -1));
  Call(m, AddRequest("GTYPE_V4", "eth1", -1, "10.200.2.1"));
  ASSERT_TRUE(vorntest::InstallFake(kHaRunning));
  ASSERT_TRUE(vorntest::InstallFake(kHeartbeat));
  Json::Value yes;
  yes["stdout"] = "1\n";
  ASSERT_TRUE(vorntest::AddFakeReply(kHaRunning, yes));
  Json::Value hb;
  hb["stdout"] = "mon.hb0\n";
  ASSERT_TRUE(vorntest::AddFakeReply(kHeartbeat, hb));
  Json::Value list = Call(m, Request("GET_GATEWAY_LIST_DATA", "GTYPE_V4"));
  ASSERT_EQ(list.size(), 2u) << list.toStyledString();
  EXPECT_EQ(list[0]["ifname"], "eth0");
  EXPECT_EQ(list[0]["priority"], 0);
  EXPECT_EQ(list[1]["ifname"], "eth1");
  EXPECT_EQ(list[1]["priority"], 2);

  // A failing heartbeat query: logged, nothing left out.
  Json::Value fail;
  fail["exit"] = 1;
  ASSERT_TRUE(vorntest::WriteFakeReplies(Json::Value(Json::objectValue)));
  ASSERT_TRUE(vorntest::AddFakeReply(kHaRunning, yes));
  ASSERT_TRUE(vorntest::AddFakeReply(kHeartbeat, fail));
  SyslogCapture log;
  list = Call(m, Request("GET_GATEWAY_LIST_DATA", "GTYPE_V4"));
  EXPECT_EQ(list.size(), 3u);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSource, "Failed to get heartbeat interface.")))
      << log.Dump();
  // An empty list answers an empty array.
  list = Call(m, Request("GET_GATEWAY_LIST_DATA", "GTYPE_V6"));
  EXPECT_TRUE(list.isArray());
  EXPECT_EQ(list.size(), 0u);
}

TEST_F(RouteModuleTest, DeleteRewritesTheListAndRefreshesButKeepsTheDatabase) {
  RouteModule m;
  Call(m, AddRequest("GTYPE_V4", "eth0", -1, "10.200.1.1", "8.8.8.8", "wan"));
  Call(m, AddRequest("GTYPE_V4", "eth1", -1, "10.200.2.1", "NULL", "wan"));
  std::string const database = ReadFile(kDatabase);
  Json::Value del = Request("DEL_GATEWAY_DATA", "GTYPE_V4");
  del["ifname"] = "eth0";
  Call(m, del);
  EXPECT_EQ(ReadFile(kV4File), Entry(0, "eth1", "10.200.2.1", "", "wan"));
  EXPECT_EQ(ReadFile(kResolv4), "");
  EXPECT_EQ(ReadFile(kDatabase), database);
  EXPECT_EQ(DefaultV4(), "default via 10.200.2.1 dev eth1 src 10.200.2.2 \n");
  // An unknown interface still rewrites the list and refreshes.
  ASSERT_TRUE(vorntest::WriteFile(kV4File, "marker\n"));
  vorntest::IpOk({"route", "del", "default"});
  del["ifname"] = "eth7";
  Call(m, del);
  EXPECT_EQ(ReadFile(kV4File), Entry(0, "eth1", "10.200.2.1", "", "wan"));
  EXPECT_EQ(DefaultV4(), "default via 10.200.2.1 dev eth1 src 10.200.2.2 \n");
}

TEST_F(RouteModuleTest, CopyMovesOrCopiesAnEntryToAnotherInterface) {
  RouteModule m;
  Call(m, AddRequest("GTYPE_V4", "eth0", -1, "10.200.1.1", "8.8.8.8", "wan"));
  Call(m, AddRequest("GTYPE_V4", "eth1", -1, "10.200.2.1", "1.1.1.1", "wan"));
  Call(m, AddRequest("GTYPE_V4", "br0", -1));
  Json::Value copy = Request("COPY_GATEWAY_DATA", "GTYPE_V4");
  copy["interface_source"] = "eth1";
  copy["interface_destination"] = "br0";
  copy["interface_source_delete"] = true;
  Call(m, copy);
  EXPECT_EQ(ReadFile(kV4File), Entry(0, "eth0", "10.200.1.1", "8.8.8.8", "wan") +
                                   Entry(1, "br0", "10.200.2.1", "1.1.1.1", "wan"));
  EXPECT_EQ(ReadFile(kResolv4), "nameserver 8.8.8.8\nnameserver 1.1.1.1\n");
  EXPECT_EQ(ReadFile(kDatabase),
            "[br0]\n\tdns=1.1.1.1\n\tgateway=10.200.2.1\n"
            "[eth0]\n\tdns=8.8.8.8\n\tgateway=10.200.1.1\n"
            "[eth1]\n\tdns=1.1.1.1\n\tgateway=10.200.2.1\n");
  copy["interface_source"] = "eth0";
  copy["interface_destination"] = "br1";
  copy["interface_source_delete"] = false;
  Call(m, copy);
  EXPECT_EQ(Names(m, GTYPE_V4), (std::vector<std::string>{"br1", "eth0", "br0"}));
  // A source that is not there only removes the destination.
  copy["interface_source"] = "eth5";
  Call(m, copy);
  EXPECT_EQ(Names(m, GTYPE_V4), (std::vector<std::string>{"eth0", "br0"}));
}

TEST_F(RouteModuleTest, AnUnknownMethodReturns0AndLeavesTheResponse) {
  RouteModule m;
  Call(m, AddRequest("GTYPE_V4", "eth0", -1, "10.200.1.1"));
  Json::Value response(Json::objectValue);
  response["x"] = 1;
  Json::Value const before = response;
  EXPECT_EQ(m.ProcessRequest(Request("NO_SUCH_METHOD", "GTYPE_V4"), response), 0);
  EXPECT_EQ(response, before);
  Json::Value noMethod = Request("GET_GATEWAY_LIST_DATA", "GTYPE_V4");
  noMethod.removeMember("method");
  EXPECT_EQ(m.ProcessRequest(noMethod, response), 0);
  EXPECT_EQ(response, before);
  Json::Value numeric = Request("GET_GATEWAY_LIST_DATA", "GTYPE_V4");
  numeric["method"] = 7;
  EXPECT_EQ(m.ProcessRequest(numeric, response), 0);
  EXPECT_EQ(response, before);
}

// Bad input: every request below is refused with a log line; lists and files stay as they were.
TEST_F(RouteModuleTest, BadInputLeavesListsAndFilesAsTheyWere) {
  RouteModule m;
  Call(m, AddRequest("GTYPE_V4", "eth0", -1, "10.200.1.1", "8.8.8.8", "wan"));
  Call(m, AddRequest("GTYPE_V6", "eth0", -1, "::", "NULL", "wan"));
  std::vector<std::string> const paths = {kV4File, kV6File, kDatabase, kResolv4, kResolv6};
  std::vector<std::string> before;
  for (auto const& p : paths) before.push_back(ReadFile(p));
  std::string const route = DefaultV4();
  std::string const route6 = DefaultV6();
  vorntest::ClearFakeJournal();

  std::vector<std::pair<Json::Value, std::string>> bad;
  auto add = [&](std::function<void(Json::Value&)> change, std::string const& line) {
    Json::Value r = AddRequest("GTYPE_V4", "eth1", 0, "10.200.2.1", "1.1.1.1", "wan");
    change(r);
    bad.emplace_back(r, line);
  };
  add([](Json::Value& r) { r["priority"] = "0"; }, "Invalid member [priority] in request");
  add([](Json::Value& r) { r["priority"] = 1.5; }, "Invalid member [priority] in request");
  add([](Json::Value& r) { r["priority"] = true; }, "Invalid member [priority] in request");
  add([](Json::Value& r) { r["type"] = "GTYPE_V5"; }, "Unknown type to add info");
  add([](Json::Value& r) { r["type"] = 0; }, "Unknown type to add info");
  add([](Json::Value& r) { r["ifname"] = 5; }, "Invalid member [ifname] in request");
  add([](Json::Value& r) { r["ifname"] = Json::Value(Json::arrayValue); },
      "Invalid member [ifname] in request");
  add([](Json::Value& r) { r["ifname"] = ""; }, "Invalid interface name []");
  add([](Json::Value& r) { r["ifname"] = "eth]1"; }, "Invalid interface name [eth]1]");
  add([](Json::Value& r) { r["ifname"] = "a=b"; }, "Invalid interface name [a=b]");
  add([](Json::Value& r) { r["gateway"] = 12; }, "Invalid member [gateway] in request");
  add([](Json::Value& r) { r["dns"] = Json::Value(Json::objectValue); },
      "Invalid member [dns] in request");
  add([](Json::Value& r) { r["class"] = false; }, "Invalid member [class] in request");

  Json::Value del = Request("DEL_GATEWAY_DATA", "GTYPE_V4");
  del["ifname"] = Json::Value(Json::arrayValue);
  bad.emplace_back(del, "Invalid member [ifname] in request");
  del["ifname"] = "";
  bad.emplace_back(del, "Invalid interface name []");
  del["type"] = "ipv4";
  bad.emplace_back(del, "Unknown type to delete info");

  Json::Value slave = Request("SET_SLAVE_DATA", "GTYPE_V4");
  slave["ifname"] = "eth0";
  slave["slave"] = "yes";
  bad.emplace_back(slave, "Invalid member [slave] in request");
  slave["type"] = "GTYPE_V7";
  bad.emplace_back(slave, "Unknown type to delete info");

  Json::Value copy = Request("COPY_GATEWAY_DATA", "GTYPE_V4");
  copy["interface_source"] = "eth0";
  copy["interface_destination"] = "br[0]";
  copy["interface_source_delete"] = true;
  bad.emplace_back(copy, "Invalid interface name [br[0]]");
  copy["interface_destination"] = "br0";
  copy["interface_source_delete"] = "true";
  bad.emplace_back(copy, "Invalid member [interface_source_delete] in request");
  copy["interface_source_delete"] = false;
  copy["interface_destination"] = "eth0";
  bad.emplace_back(copy, "Source and destination are the same interface [eth0]");
  copy["type"] = "ALL";
  bad.emplace_back(copy, "Unknown type to get data");

  bad.emplace_back(Request("REFRESH_GATEWAY", "all"), "Unknown type to add info");
  Json::Value refresh = Request("REFRESH_GATEWAY", "GTYPE_V4");
  refresh["type"] = Json::Value(Json::arrayValue);
  bad.emplace_back(refresh, "Unknown type to add info");
  bad.emplace_back(Request("GET_GATEWAY_LIST_DATA", "V4"), "Unknown type to get data");
  Json::Value byIf = Request("GET_GATEWAY_DATA_BY_INTERFACE", "GTYPE_V4");
  byIf["ifname"] = 3;
  bad.emplace_back(byIf, "Invalid member [ifname] in request");

  for (auto const& item : bad) {
    SyslogCapture log;
    Json::Value response(Json::objectValue);
    response["untouched"] = true;
    Json::Value const responseBefore = response;
    int rc = -1;
    EXPECT_NO_THROW(rc = m.ProcessRequest(item.first, response));
    EXPECT_EQ(rc, 0);
    EXPECT_EQ(response, responseBefore) << item.first.toStyledString();
    EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSource, item.second)))
        << item.first.toStyledString() << log.Dump();
    for (size_t i = 0; i < paths.size(); ++i) {
      EXPECT_EQ(ReadFile(paths[i]), before[i]) << paths[i] << item.first.toStyledString();
    }
    EXPECT_EQ(Names(m, GTYPE_V4), (std::vector<std::string>{"eth0"}));
    EXPECT_EQ(Names(m, GTYPE_V6), (std::vector<std::string>{"eth0"}));
  }
  // Requests that are no objects do nothing.
  for (Json::Value const& r : {Json::Value(Json::arrayValue), Json::Value("ADD_GATEWAY_DATA"),
                               Json::Value(3), Json::Value()}) {
    Json::Value response;
    EXPECT_NO_THROW(EXPECT_EQ(m.ProcessRequest(r, response), 0));
    EXPECT_TRUE(response.isNull());
  }
  for (size_t i = 0; i < paths.size(); ++i) EXPECT_EQ(ReadFile(paths[i]), before[i]);
  EXPECT_EQ(DefaultV4(), route);
  EXPECT_EQ(DefaultV6(), route6);
  EXPECT_TRUE(FakeCallsTo(kGatewayHook).empty());
  EXPECT_TRUE(FakeCallsTo(kDnsHook).empty());
}

// A name the kernel would accept but a shell would not: it reaches /sbin/ip as one argument.
TEST_F(RouteModuleTest, InterfaceNamesReachIpOnlyAsArguments) {
  RouteModule m;
  char cwd[4096];
  ASSERT_NE(getcwd(cwd, sizeof cwd), nullptr);
  ASSERT_EQ(chdir("/tmp"), 0);
  Call(m, AddRequest("GTYPE_V4", "x;id>pwn", -1, "10.200.1.1"));
  Call(m, AddRequest("GTYPE_V4", "$(id>pwn2)", -1, "10.200.1.1"));
  EXPECT_FALSE(vorntest::Exists("/tmp/pwn"));
  EXPECT_FALSE(vorntest::Exists("/tmp/pwn2"));
  EXPECT_EQ(chdir(cwd), 0);
  EXPECT_EQ(Names(m, GTYPE_V4), (std::vector<std::string>{"x;id>pwn", "$(id>pwn2)"}));
  EXPECT_EQ(DefaultV4(), "");
}

TEST_F(RouteModuleTest, IsDatabaseChangedComparesWithTheStoredValue) {
  RouteModule m;
  EXPECT_EQ(m.IsDatabaseChanged("eth0", "gateway", "10.200.1.1"), 1);  // no database
  Call(m, AddRequest("GTYPE_V4", "eth0", -1, "10.200.1.1", "8.8.8.8"));
  EXPECT_EQ(m.IsDatabaseChanged("eth0", "gateway", "10.200.1.1"), 0);
  EXPECT_EQ(m.IsDatabaseChanged("eth0", "gateway", "10.200.1.2"), 1);
  EXPECT_EQ(m.IsDatabaseChanged("eth1", "gateway", "10.200.1.1"), 1);  // no section
  Json::Value r = AddRequest("GTYPE_V6", "eth0", -1, "::1");
  EXPECT_EQ(m.IsGatewayConfigChanged(r), 1);
  r["type"] = "GTYPE_V4";
  r["gateway"] = "10.200.1.1";
  EXPECT_EQ(m.IsGatewayConfigChanged(r), 0);
  r["gateway"] = "NULL";
  EXPECT_EQ(m.IsGatewayConfigChanged(r), 0);
  r["dns"] = "8.8.8.8";
  EXPECT_EQ(m.IsDnsConfigChanged(r), 0);
  r["dns"] = "8.8.4.4";
  EXPECT_EQ(m.IsDnsConfigChanged(r), 1);
  SyslogCapture log;
  r["type"] = "X";
  EXPECT_EQ(m.IsDnsConfigChanged(r), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSource, "Unknown type"))) << log.Dump();
}

TEST_F(RouteModuleTest, UnwritableConfigDirectoryLogsTheFileAndKeepsItsContent) {
  RouteModule m;
  Call(m, AddRequest("GTYPE_V4", "eth0", -1, "10.200.1.1", "8.8.8.8"));
  std::string const before = ReadFile(kV4File);
  SyslogCapture log;
  {
    vorntest::ReadOnlyMount ro("/etc/iproute2/config");
    ASSERT_TRUE(ro.ok());
    Call(m, AddRequest("GTYPE_V4", "eth1", -1, "10.200.2.1", "1.1.1.1"));
  }
  EXPECT_TRUE(
      log.HasOnce(LOG_ERR, LogLine(kSource, std::string("Failed to set file[") + kV4File + "]")))
      << log.Dump();
  EXPECT_EQ(ReadFile(kV4File), before);
  // Stage 5 hooks do not run after a failed write.
  auto calls = Argvs(kGatewayHook);
  ASSERT_FALSE(calls.empty());
  EXPECT_EQ(calls.back()[0], "4");
}

TEST_F(RouteModuleTest, RefreshAllRunsBothFamilies) {
  vorntest::IpOk({"-6", "addr", "replace", "2001:db8:1::2/64", "dev", "eth0", "nodad"});
  PeerIp("eth0", {"-6", "addr", "replace", "2001:db8:1::1/64", "dev", "eth0", "nodad"});
  RouteModule m;
  Call(m, AddRequest("GTYPE_V4", "eth0", -1, "10.200.1.1"));
  Call(m, AddRequest("GTYPE_V6", "eth0", -1, "2001:db8:1::1"));
  vorntest::IpOk({"route", "del", "default"});
  vorntest::IpOk({"-6", "route", "del", "default"});
  Call(m, Request("REFRESH_GATEWAY", "ALL"));
  EXPECT_EQ(DefaultV4(), "default via 10.200.1.1 dev eth0 src 10.200.1.2 \n");
  EXPECT_EQ(DefaultV6(), "default via 2001:db8:1::1 dev eth0 metric 1024 pref medium\n");
  vorntest::IpOk({"-6", "addr", "del", "2001:db8:1::2/64", "dev", "eth0"});
}

TEST_F(RouteModuleTest, AResolverFileThatCannotBeOpenedStopsTheAdd) {
  RouteModule m;
  Call(m, AddRequest("GTYPE_V4", "eth0", -1, "10.200.1.1", "8.8.8.8"));
  vorntest::Run({"/bin/rm", "-f", kResolv4});
  ASSERT_EQ(vorntest::Run({"/bin/mkdir", kResolv4}).status, 0);
  std::string const database = ReadFile(kDatabase);
  SyslogCapture log;
  Call(m, AddRequest("GTYPE_V4", "eth1", -1, "10.200.2.1", "1.1.1.1"));
  EXPECT_TRUE(
      log.HasOnce(LOG_ERR, LogLine(kSource, std::string("Failed to open file[") + kResolv4 + "]")))
      << log.Dump();
  // The list was written, the database was not, the stage 5 hooks did not run.
  EXPECT_EQ(Names(m, GTYPE_V4), (std::vector<std::string>{"eth0", "eth1"}));
  EXPECT_NE(ReadFile(kV4File).find("eth1"), std::string::npos);
  EXPECT_EQ(ReadFile(kDatabase), database);
  EXPECT_EQ(Argvs(kDnsHook).back(), (Args{"4", "eth1", "1.1.1.1"}));
  vorntest::Run({"/bin/rmdir", kResolv4});
}

TEST_F(RouteModuleTest, ADatabaseThatCannotBeReadIsLogged) {
  RouteModule m;
  vorntest::Run({"/bin/mkdir", "-p", kDatabase});
  SyslogCapture log;
  Call(m, AddRequest("GTYPE_V4", "eth0", -1, "10.200.1.1", "8.8.8.8"));
  // IsGatewayConfigChanged, IsDnsConfigChanged and the database write each read it.
  EXPECT_EQ(log.Matching(LogLine(kSource, std::string("Failed to read config [") + kDatabase + "]"))
                .size(),
            3u)
      << log.Dump();
  // -1 from the database check is no change: no hook ran.
  EXPECT_TRUE(FakeCallsTo(kGatewayHook).empty());
  EXPECT_TRUE(FakeCallsTo(kDnsHook).empty());
  EXPECT_EQ(ReadFile(kV4File), Entry(0, "eth0", "10.200.1.1", "8.8.8.8", "unknown"));
  vorntest::Run({"/bin/rmdir", kDatabase});
}

// The D-Bus main loop and the IPv6 watch thread both come here: the mutex keeps the lists whole.
TEST_F(RouteModuleTest, ConcurrentRequestsKeepEveryEntry) {
  RouteModule m;
  auto worker = [&m](std::string const& prefix) {
    for (int i = 0; i < 15; ++i) {
      Json::Value response;
      m.ProcessRequest(AddRequest("GTYPE_V6", prefix + std::to_string(i), -1), response);
      m.ProcessRequest(Request("GET_GATEWAY_LIST_DATA", "GTYPE_V6"), response);
    }
  };
  std::thread a(worker, "ta");
  std::thread b(worker, "tb");
  a.join();
  b.join();
  std::vector<std::string> names = Names(m, GTYPE_V6);
  EXPECT_EQ(names.size(), 30u);
  std::sort(names.begin(), names.end());
  EXPECT_EQ(std::unique(names.begin(), names.end()), names.end());
  RouteModule back;
  back.InitialModule();
  // None of these interfaces exist, so a restart drops them all.
  EXPECT_TRUE(Names(back, GTYPE_V6).empty());
}

TEST_F(RouteModuleTest, APriorityFileThatCannotBeReadLeavesTheListAndIsLogged) {
  vorntest::Run({"/bin/mkdir", "-p", kV4File});
  SyslogCapture log;
  RouteModule m;
  EXPECT_EQ(m.ReadGatewayListFromFile(GTYPE_V4), -1);
  EXPECT_EQ(m.InitialModule(), 0);
  EXPECT_TRUE(Names(m, GTYPE_V4).empty());
  EXPECT_EQ(
      log.Matching(LogLine(kSource, std::string("Failed to read config [") + kV4File + "]")).size(),
      2u)
      << log.Dump();
  // A missing file is no failure.
  EXPECT_EQ(m.ReadGatewayListFromFile(GTYPE_V6), 0);
  vorntest::Run({"/bin/rmdir", kV4File});
}

namespace {

// Corrections seen from a client's side: what the module stores instead of refusing.
TEST_F(RouteModuleTest, AddressesThatAreNoAddressesAreStoredEmpty) {
  RouteModule m;
  Call(m, AddRequest("GTYPE_V4", "eth0", -1, "10.200.1.300", "gateway; rm -rf /", "wan"));
  EXPECT_EQ(ReadFile(kV4File),
            "[0]\n\tclass=wan\n\tdns=\n\tgateway=\n\tifname=eth0\n\tslave=no\n");
  Json::Value request = Request("GET_GATEWAY_DATA_BY_INTERFACE", "GTYPE_V4");
  request["ifname"] = "eth0";
  Json::Value response = Call(m, request);
  EXPECT_EQ(response["exist"], Json::Value(true));
  EXPECT_EQ(response["gateway"], Json::Value(""));
  EXPECT_EQ(response["dns"], Json::Value(""));
}

TEST_F(RouteModuleTest, AbsentPriorityReadsAsZero) {
  RouteModule m;
  Call(m, AddRequest("GTYPE_V4", "eth0", -1, "10.200.1.1"));
  Json::Value r = AddRequest("GTYPE_V4", "eth1", -1, "10.200.2.1");
  r.removeMember("priority");
  Call(m, r);
  EXPECT_EQ(Names(m, GTYPE_V4), (std::vector<std::string>{"eth1", "eth0"}));
}

TEST_F(RouteModuleTest, AliasNamesCanBeAddedAndDeletedAndLineBreaksAreRefused) {
  RouteModule m;
  Call(m, AddRequest("GTYPE_V4", "eth0:1", -1, "10.200.1.1", "NULL", "wan"));
  EXPECT_EQ(Names(m, GTYPE_V4), (std::vector<std::string>{"eth0:1"}));
  EXPECT_EQ(ReadFile(kDatabase), "[eth0:1]\n\tdns=\n\tgateway=10.200.1.1\n");
  Json::Value del = Request("DEL_GATEWAY_DATA", "GTYPE_V4");
  del["ifname"] = "eth0:1";
  Call(m, del);
  EXPECT_TRUE(Names(m, GTYPE_V4).empty());
  std::string const before = ReadFile(kV4File);
  Call(m, AddRequest("GTYPE_V4", "eth1\n[x]", -1, "10.200.2.1"));
  Call(m, AddRequest("GTYPE_V4", "eth1\r", -1, "10.200.2.1"));
  Call(m, AddRequest("GTYPE_V4", "eth1", -1, "10.200.2.1", "NULL", "wan\n[0]"));
  EXPECT_TRUE(Names(m, GTYPE_V4).empty());
  EXPECT_EQ(ReadFile(kV4File), before);
}

}  // namespace
