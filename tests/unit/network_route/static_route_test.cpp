// StaticRoute against the real kernel: veth eth0 (10.200.1.2/24, peer 10.200.1.1), eth1
// (10.200.2.2/24, peer 10.200.2.1), the real /sbin/ip and the static table's rule files.
#include "vornwireless/network/route/static_route.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "vornwireless/network/route/policy_route.h"

using vornnetwork::network::IPTYPE_V4;
using vornnetwork::network::IPTYPE_V6;
using vornnetwork::network::PolicyRoute;
using vornnetwork::network::StaticRoute;
using vornnetwork::network::StaticRouteRule;
using vorntest::ReadFile;
using vorntest::SyslogCapture;

namespace {

const std::string kDir = "/etc/iproute2/config/";
const std::string kV4File = kDir + "static-table-rule";
const std::string kV6File = kDir + "static-table-rule-v6";

std::string Routes(bool v6 = false) {
  auto r = v6 ? vorntest::Ip({"-6", "route", "show", "table", "static-table"})
              : vorntest::Ip({"route", "show", "table", "static-table"});
  return r.out;
}

Json::Value Rule(std::string const& ifname, std::string const& ip, std::string const& mask,
                 std::string const& gateway, bool enable) {
  Json::Value r(Json::objectValue);
  r["ifname"] = ifname;
  r["ip"] = ip;
  r["mask"] = mask;
  r["gateway"] = gateway;
  r["enable"] = enable;
  return r;
}

// One section of an IPv4 rule file (keys in the sorted order of section files).
std::string Section(int i, bool enable, std::string const& gateway, std::string const& ifname,
                    std::string const& ip, std::string const& mask, bool v6 = false) {
  return "[" + std::to_string(i) + "]\n\tenable=" + (enable ? "yes" : "no") +
         "\n\tgateway=" + gateway + "\n\tifname=" + ifname + "\n\tip=" + ip + "\n\t" +
         (v6 ? "prefix_length=" : "mask=") + mask + "\n";
}

class StaticRouteTest : public ::testing::Test {
 protected:
  void SetUp() override {
    vorntest::Run({"/bin/rm", "-rf", "/etc/iproute2/config", "/etc/iproute2/rt_tables"});
    vorntest::Ip({"-6", "addr", "add", "2001:db8:1::2/64", "dev", "eth0", "nodad"});
    // The static table exists as at every daemon start.
    PolicyRoute policy;
    ASSERT_EQ(policy.EnableTable(IPTYPE_V4, "static", "all"), 0);
    ASSERT_EQ(policy.EnableTable(IPTYPE_V6, "static", "all"), 0);
    vorntest::Ip({"route", "flush", "table", "static-table"});
    vorntest::Ip({"-6", "route", "flush", "table", "static-table"});
  }
};

TEST_F(StaticRouteTest, ElevenRulesAreWrittenInSectionOrderAndReportTheirKernelState) {
  Json::Value rules(Json::arrayValue);
  rules.append(Rule("eth0", "10.30.0.0", "255.255.0.0", "10.200.1.1", true));      // 0 on
  rules.append(Rule("eth0", "10.31.0.5", "255.255.255.255", "10.200.1.1", true));  // 1 host
  rules.append(Rule("eth0", "10.32.0.0", "255.255.255.0", "10.200.1.1", false));   // 2 off
  rules.append(Rule("eth0", "10.33.0.0", "255.255.0.0", "192.168.99.1", true));    // 3 unreachable
  rules.append(Rule("eth0", "10.34.0.0", "255.0.255.0", "10.200.1.1", true));      // 4 bad mask
  rules.append(Rule("nosuch0", "10.35.0.0", "255.255.0.0", "10.200.1.1", true));   // 5 no device
  rules.append(Rule("eth1", "10.36.0.0", "255.255.0.0", "10.200.2.1", true));      // 6 on
  rules.append(Rule("eth1", "10.37.1.0", "255.255.255.0", "10.200.2.1", true));    // 7 on
  rules.append(Rule("eth0", "10.38.0.0", "255.255.0.0", "10.200.1.1", true));      // 8 on
  rules.append(Rule("eth0", "10.39.7.9", "255.255.0.0", "10.200.1.1", true));      // 9 host bits
  rules.append(Rule("eth1", "10.40.0.0", "255.255.0.0", "10.200.2.1", true));      // 10 on
  StaticRoute route;
  ASSERT_EQ(route.SetRules(IPTYPE_V4, rules), 0);

  EXPECT_EQ(ReadFile(kV4File),
            Section(0, true, "10.200.1.1", "eth0", "10.30.0.0", "255.255.0.0") +
                Section(1, true, "10.200.1.1", "eth0", "10.31.0.5", "255.255.255.255") +
                Section(10, true, "10.200.2.1", "eth1", "10.40.0.0", "255.255.0.0") +
                Section(2, false, "10.200.1.1", "eth0", "10.32.0.0", "255.255.255.0") +
                Section(3, true, "192.168.99.1", "eth0", "10.33.0.0", "255.255.0.0") +
                Section(4, true, "10.200.1.1", "eth0", "10.34.0.0", "255.0.255.0") +
                Section(5, true, "10.200.1.1", "nosuch0", "10.35.0.0", "255.255.0.0") +
                Section(6, true, "10.200.2.1", "eth1", "10.36.0.0", "255.255.0.0") +
                Section(7, true, "10.200.2.1", "eth1", "10.37.1.0", "255.255.255.0") +
                Section(8, true, "10.200.1.1", "eth0", "10.38.0.0", "255.255.0.0") +
                Section(9, true, "10.200.1.1", "eth0", "10.39.7.9", "255.255.0.0"));
  EXPECT_EQ(Routes(),
            "10.30.0.0/16 via 10.200.1.1 dev eth0 \n"
            "10.31.0.5 via 10.200.1.1 dev eth0 \n"
            "10.36.0.0/16 via 10.200.2.1 dev eth1 \n"
            "10.37.1.0/24 via 10.200.2.1 dev eth1 \n"
            "10.38.0.0/16 via 10.200.1.1 dev eth0 \n"
            "10.39.0.0/16 via 10.200.1.1 dev eth0 \n"
            "10.40.0.0/16 via 10.200.2.1 dev eth1 \n");

  Json::Value got(Json::arrayValue);
  ASSERT_EQ(route.GetRules(IPTYPE_V4, got), 0);
  ASSERT_EQ(got.size(), 11u);
  // String order of the sections: 0, 1, 10, 2, 3, ...
  std::vector<std::string> ips, active;
  for (auto const& r : got) {
    ips.push_back(r["ip"].asString());
    active.push_back(r["active"].asString());
  }
  EXPECT_EQ(ips, (std::vector<std::string>{"10.30.0.0", "10.31.0.5", "10.40.0.0", "10.32.0.0",
                                           "10.33.0.0", "10.34.0.0", "10.35.0.0", "10.36.0.0",
                                           "10.37.1.0", "10.38.0.0", "10.39.7.9"}));
  EXPECT_EQ(active, (std::vector<std::string>{"Enabled", "Enabled", "Enabled", "Disabled",
                                              "Disabled", "Disabled", "Disabled", "Enabled",
                                              "Enabled", "Enabled", "Enabled"}));
  EXPECT_EQ(got[3]["enable"], Json::Value(false));
  EXPECT_EQ(got[0]["enable"], Json::Value(true));
  EXPECT_EQ(got[0]["mask"], Json::Value("255.255.0.0"));
  EXPECT_EQ(got[0]["gateway"], Json::Value("10.200.1.1"));
  EXPECT_EQ(got[0]["ifname"], Json::Value("eth0"));
}

TEST_F(StaticRouteTest, HostRouteWithAllOnesMaskIsFoundAlthoughListedWithoutPrefix) {
  StaticRouteRule rule;
  rule.type = IPTYPE_V4;
  rule.ifname = "eth0";
  rule.ip = std::string("10.31.0.5");
  rule.mask = std::string("255.255.255.255");
  rule.gateway = std::string("10.200.1.1");
  StaticRoute route;
  EXPECT_EQ(route.CheckRuleExist(rule), -1);
  ASSERT_EQ(route.AddRule(rule), 0);
  EXPECT_EQ(Routes(), "10.31.0.5 via 10.200.1.1 dev eth0 \n");
  EXPECT_EQ(route.CheckRuleExist(rule), 0);
  EXPECT_EQ(route.DeleteRule(rule), 0);
  EXPECT_EQ(route.CheckRuleExist(rule), -1);
}

TEST_F(StaticRouteTest, IPv6RulesPrefix128AndHostBitsAndBadPrefixes) {
  Json::Value rules(Json::arrayValue);
  rules.append(Rule("eth0", "2001:db8:50::", "48", "2001:db8:1::1", true));     // 0 on
  rules.append(Rule("eth0", "2001:db8:51::7", "128", "2001:db8:1::1", true));   // 1 /128
  rules.append(Rule("eth0", "2001:db8:52::9", "64", "2001:db8:1::1", true));    // 2 host bits
  rules.append(Rule("eth0", "2001:db8:53::", "abc", "2001:db8:1::1", true));    // 3 bad prefix
  rules.append(Rule("eth0", "2001:db8:54::", "129", "2001:db8:1::1", true));    // 4 too long
  rules.append(Rule("eth0", "2001:db8:55::", "64", "2001:db8:1::1", false));    // 5 off
  StaticRoute route;
  ASSERT_EQ(route.SetRules(IPTYPE_V6, rules), 0);
  EXPECT_EQ(ReadFile(kV6File),
            Section(0, true, "2001:db8:1::1", "eth0", "2001:db8:50::", "48", true) +
                Section(1, true, "2001:db8:1::1", "eth0", "2001:db8:51::7", "128", true) +
                Section(2, true, "2001:db8:1::1", "eth0", "2001:db8:52::9", "64", true) +
                Section(3, true, "2001:db8:1::1", "eth0", "2001:db8:53::", "abc", true) +
                Section(4, true, "2001:db8:1::1", "eth0", "2001:db8:54::", "129", true) +
                Section(5, false, "2001:db8:1::1", "eth0", "2001:db8:55::", "64", true));
  std::string const table = Routes(true);
  EXPECT_NE(table.find("2001:db8:50::/48 via 2001:db8:1::1 dev eth0"), std::string::npos);
  EXPECT_NE(table.find("2001:db8:51::7 via 2001:db8:1::1 dev eth0"), std::string::npos);
  // Added with its network part.
  EXPECT_NE(table.find("2001:db8:52::/64 via 2001:db8:1::1 dev eth0"), std::string::npos);
  EXPECT_EQ(table.find("2001:db8:53::"), std::string::npos);
  EXPECT_EQ(table.find("2001:db8:54::"), std::string::npos);
  EXPECT_EQ(table.find("2001:db8:55::"), std::string::npos);

  Json::Value got(Json::arrayValue);
  ASSERT_EQ(route.GetRules(IPTYPE_V6, got), 0);
  ASSERT_EQ(got.size(), 6u);
  EXPECT_EQ(got[0]["active"], Json::Value("Enabled"));
  EXPECT_EQ(got[1]["active"], Json::Value("Enabled"));
  // Looked for as given (with its host bits): not found.
  EXPECT_EQ(got[2]["active"], Json::Value("Disabled"));
  EXPECT_EQ(got[3]["active"], Json::Value("Disabled"));
  EXPECT_EQ(got[4]["active"], Json::Value("Disabled"));
  EXPECT_EQ(got[5]["active"], Json::Value("Disabled"));
  // "mask" carries the prefix length in JSON.
  EXPECT_EQ(got[0]["mask"], Json::Value("48"));
}

TEST_F(StaticRouteTest, DisabledRuleReportsDisabledWithoutAskingTheKernel) {
  ASSERT_TRUE(vorntest::WriteFile(
      kV4File, Section(0, false, "10.200.1.1", "eth0", "10.60.0.0", "255.255.0.0")));
  // The kernel holds exactly this route, yet the rule is off.
  vorntest::IpOk({"route", "add", "10.60.0.0/16", "via", "10.200.1.1", "dev", "eth0", "table",
                  "static-table"});
  StaticRoute route;
  Json::Value got(Json::arrayValue);
  ASSERT_EQ(route.GetRules(IPTYPE_V4, got), 0);
  ASSERT_EQ(got.size(), 1u);
  EXPECT_EQ(got[0]["active"], Json::Value("Disabled"));
  EXPECT_EQ(got[0]["enable"], Json::Value(false));
}

TEST_F(StaticRouteTest, EmptyArrayFlushesTheTableAndLeavesAnEmptyFile) {
  Json::Value rules(Json::arrayValue);
  rules.append(Rule("eth0", "10.30.0.0", "255.255.0.0", "10.200.1.1", true));
  StaticRoute route;
  ASSERT_EQ(route.SetRules(IPTYPE_V4, rules), 0);
  ASSERT_NE(Routes(), "");
  Json::Value empty(Json::arrayValue);
  ASSERT_EQ(route.SetRules(IPTYPE_V4, empty), 0);
  EXPECT_EQ(Routes(), "");
  EXPECT_TRUE(vorntest::Exists(kV4File));
  EXPECT_EQ(ReadFile(kV4File), "");
}

TEST_F(StaticRouteTest, GetRulesWithMissingFileGivesNothingAndZero) {
  StaticRoute route;
  Json::Value got(Json::arrayValue);
  EXPECT_EQ(route.GetRules(IPTYPE_V4, got), 0);
  EXPECT_EQ(route.GetRules(IPTYPE_V6, got), 0);
  EXPECT_EQ(got.size(), 0u);
}

TEST_F(StaticRouteTest, WrongJsonTypesAreRefusedAndChangeNothing) {
  Json::Value rules(Json::arrayValue);
  rules.append(Rule("eth0", "10.30.0.0", "255.255.0.0", "10.200.1.1", true));
  StaticRoute route;
  ASSERT_EQ(route.SetRules(IPTYPE_V4, rules), 0);
  std::string const file = ReadFile(kV4File);
  std::string const table = Routes();

  SyslogCapture log;
  Json::Value bad(Json::arrayValue);
  bad.append(Rule("eth1", "10.36.0.0", "255.255.0.0", "10.200.2.1", true));
  bad.append(Rule("eth1", "10.37.0.0", "255.255.0.0", "10.200.2.1", true));
  bad[1]["enable"] = "yes";  // a string, not true or false
  EXPECT_EQ(route.SetRules(IPTYPE_V4, bad), -1);
  Json::Value lineBreak(Json::arrayValue);
  lineBreak.append(Rule("eth0\n[x]", "10.36.0.0", "255.255.0.0", "10.200.2.1", true));
  EXPECT_EQ(route.SetRules(IPTYPE_V4, lineBreak), -1);
  Json::Value notArray(Json::objectValue);
  EXPECT_EQ(route.SetRules(IPTYPE_V4, notArray), -1);
  Json::Value notObject(Json::arrayValue);
  notObject.append(7);
  EXPECT_EQ(route.SetRules(IPTYPE_V4, notObject), -1);
  EXPECT_EQ(ReadFile(kV4File), file);
  EXPECT_EQ(Routes(), table);
  EXPECT_EQ(log.Matching("network/route/static_route.cpp:[0-9]+ Bad parameter: ").size(), 4u) << log.Dump();
}

TEST_F(StaticRouteTest, TestRuleVaildLetsTheKernelJudgeAndLeavesNoProbe) {
  StaticRoute route;
  StaticRouteRule rule;
  rule.type = IPTYPE_V4;
  rule.ifname = "eth0";
  rule.ip = std::string("10.44.3.9");
  rule.mask = std::string("255.255.0.0");
  rule.gateway = std::string("10.200.1.1");
  Json::Value result(Json::objectValue);
  ASSERT_EQ(route.TestRuleVaild(rule, result), 0);
  EXPECT_EQ(result["ip"], Json::Value("10.44.0.0"));
  EXPECT_EQ(Routes(), "");

  rule.gateway = std::string("192.168.99.1");  // not reachable from eth0
  Json::Value refused(Json::objectValue);
  EXPECT_EQ(route.TestRuleVaild(rule, refused), -1);
  EXPECT_FALSE(refused.isMember("ip"));
  rule.gateway = std::string("10.200.1.1");
  rule.mask = std::string("255.0.255.0");
  EXPECT_EQ(route.TestRuleVaild(rule, refused), -1);
  EXPECT_EQ(Routes(), "");

  StaticRouteRule v6;
  v6.type = IPTYPE_V6;
  v6.ifname = "eth0";
  v6.ip = std::string("2001:db8:52::9");
  v6.prefix_length = "64";
  v6.gateway = std::string("2001:db8:1::1");
  ASSERT_EQ(route.TestRuleVaild(v6, result), 0);
  EXPECT_EQ(result["ip"], Json::Value("2001:db8:52::"));
  EXPECT_EQ(Routes(true).find("2001:db8:52::"), std::string::npos);
}

TEST_F(StaticRouteTest, RefreshRebuildsTheTableFromTheFiles) {
  ASSERT_TRUE(vorntest::WriteFile(
      kV4File, Section(0, true, "10.200.1.1", "eth0", "10.61.0.0", "255.255.0.0") +
                   Section(1, false, "10.200.1.1", "eth0", "10.62.0.0", "255.255.0.0")));
  ASSERT_TRUE(vorntest::WriteFile(
      kV6File, Section(0, true, "2001:db8:1::1", "eth0", "2001:db8:61::", "48", true)));
  vorntest::IpOk({"route", "add", "10.63.0.0/16", "via", "10.200.1.1", "dev", "eth0", "table",
                  "static-table"});
  StaticRoute route;
  ASSERT_EQ(route.RefreshRules(), 0);
  EXPECT_EQ(Routes(), "10.61.0.0/16 via 10.200.1.1 dev eth0 \n");
  EXPECT_NE(Routes(true).find("2001:db8:61::/48 via 2001:db8:1::1 dev eth0"), std::string::npos);
}

TEST(StaticRouteParse, DevLineGivesZeroGatewayInterfaceAndMetricZero) {
  Json::Value route(Json::objectValue);
  ASSERT_TRUE(StaticRoute::ParseRouteLine(IPTYPE_V4, "10.0.0.0/8 dev eth0 scope link \n", route));
  EXPECT_EQ(route["ip"], Json::Value("10.0.0.0"));
  EXPECT_EQ(route["mask"], Json::Value("255.0.0.0"));
  EXPECT_EQ(route["gateway"], Json::Value("0.0.0.0"));
  EXPECT_EQ(route["ifname"], Json::Value("eth0"));
  EXPECT_EQ(route["metric"], Json::Value("0"));
}

TEST(StaticRouteParse, ViaDefaultHostAndMetric) {
  Json::Value route(Json::objectValue);
  ASSERT_TRUE(StaticRoute::ParseRouteLine(
      IPTYPE_V4, "default via 10.200.1.1 dev eth0 proto static metric 20 \n", route));
  EXPECT_EQ(route["ip"], Json::Value("default"));
  EXPECT_EQ(route["mask"], Json::Value("0.0.0.0"));
  EXPECT_EQ(route["gateway"], Json::Value("10.200.1.1"));
  EXPECT_EQ(route["ifname"], Json::Value("eth0"));
  EXPECT_EQ(route["metric"], Json::Value("20"));
  ASSERT_TRUE(StaticRoute::ParseRouteLine(IPTYPE_V4, "10.1.2.3 via 10.200.1.1 dev eth1 \n",
                                          route));
  EXPECT_EQ(route["mask"], Json::Value("255.255.255.255"));
  EXPECT_EQ(route["ifname"], Json::Value("eth1"));
  Json::Value v6(Json::objectValue);
  ASSERT_TRUE(StaticRoute::ParseRouteLine(
      IPTYPE_V6, "2001:db8::/32 dev eth0 metric 1024 pref medium\n", v6));
  EXPECT_EQ(v6["ip"], Json::Value("2001:db8::/32"));
  EXPECT_EQ(v6["gateway"], Json::Value("::"));
  EXPECT_EQ(v6["metric"], Json::Value("1024"));
  EXPECT_FALSE(v6.isMember("mask"));
}

TEST(StaticRouteParse, UnreachableAndNexthopLinesKeepTheKeysOfTheLineBefore) {
  Json::Value route(Json::objectValue);
  ASSERT_TRUE(StaticRoute::ParseRouteLine(IPTYPE_V4, "10.0.0.0/8 dev eth0 scope link\n", route));
  ASSERT_TRUE(StaticRoute::ParseRouteLine(IPTYPE_V4, "unreachable 10.9.0.0/16 \n", route));
  EXPECT_EQ(route["ip"], Json::Value("unreachable"));
  EXPECT_EQ(route["mask"], Json::Value("255.255.255.255"));
  EXPECT_EQ(route["gateway"], Json::Value("0.0.0.0"));
  EXPECT_EQ(route["ifname"], Json::Value("eth0"));
  EXPECT_EQ(route["metric"], Json::Value("0"));
  ASSERT_TRUE(StaticRoute::ParseRouteLine(
      IPTYPE_V4, "\tnexthop via 10.200.2.1 dev eth1 weight 1 \n", route));
  EXPECT_EQ(route["ip"], Json::Value("nexthop"));
  EXPECT_EQ(route["gateway"], Json::Value("10.200.2.1"));
  EXPECT_EQ(route["ifname"], Json::Value("eth1"));
  // First line of a multipath route: nothing but the destination.
  Json::Value first(Json::objectValue);
  ASSERT_TRUE(StaticRoute::ParseRouteLine(IPTYPE_V4, "10.70.0.0/16 \n", first));
  EXPECT_FALSE(first.isMember("gateway"));
  EXPECT_FALSE(first.isMember("ifname"));
  // A metric word at the end of a line gives "0"; an empty line does not crash.
  ASSERT_TRUE(StaticRoute::ParseRouteLine(IPTYPE_V4, "10.1.0.0/16 dev eth0 metric", first));
  EXPECT_EQ(first["metric"], Json::Value("0"));
  ASSERT_TRUE(StaticRoute::ParseRouteLine(IPTYPE_V4, "", first));
  ASSERT_TRUE(StaticRoute::ParseRouteLine(IPTYPE_V4, "999.1.1.1/77 via", first));
}

TEST(StaticRouteParse, HeartbeatInterfaceIsLeftOut) {
  Json::Value route(Json::objectValue);
  EXPECT_FALSE(StaticRoute::ParseRouteLine(IPTYPE_V4, "169.254.0.0/16 dev mon.hb0 scope link\n",
                                           route));
}

TEST_F(StaticRouteTest, TableInfoOfARealTableWithUnreachableAndMultipathRoutes) {
  vorntest::IpOk({"route", "add", "10.0.0.0/8", "dev", "eth0", "table", "static-table"});
  vorntest::IpOk({"route", "add", "unreachable", "10.9.0.0/16", "table", "static-table"});
  vorntest::IpOk({"route", "add", "10.70.0.0/16", "table", "static-table", "nexthop", "via",
                  "10.200.1.1", "dev", "eth0", "nexthop", "via", "10.200.2.1", "dev", "eth1"});
  StaticRoute route;
  Json::Value info;
  // No daemon runs here: the static table's class needs none.
  ASSERT_EQ(route.GetTableInfo(IPTYPE_V4, "static-table", info), 0);
  EXPECT_EQ(info["name"], Json::Value("static-table"));
  EXPECT_EQ(info["class"], Json::Value("unknown"));
  ASSERT_TRUE(info["rules"].isArray());
  ASSERT_EQ(info["rules"].size(), 5u) << info.toStyledString();
  EXPECT_EQ(info["rules"][0]["ip"], Json::Value("10.0.0.0"));
  EXPECT_EQ(info["rules"][0]["gateway"], Json::Value("0.0.0.0"));
  EXPECT_EQ(info["rules"][0]["metric"], Json::Value("0"));
  // A table without routes, or one the kernel cannot name, is shown empty.
  Json::Value none;
  EXPECT_EQ(route.GetTableInfo(IPTYPE_V4, "nosuch-table", none), 0);
  EXPECT_EQ(none["rules"], Json::Value(Json::arrayValue));
  EXPECT_EQ(route.GetTableInfo(IPTYPE_V4, "9", none), 0);
  EXPECT_EQ(none["rules"], Json::Value(Json::arrayValue));
}

}  // namespace

namespace {

// Seeded random listing lines (printable words, blanks, tabs, slashes, keywords, long lines):
// the parser never crashes and always leaves the four text keys and a metric.
TEST(StaticRouteParse, RandomListingLinesNeverBreakTheParser) {
  unsigned seed = 20261125;
  auto next = [&seed]() {
    seed = seed * 1103515245u + 12345u;
    return (seed >> 8) & 0xffffff;
  };
  char const* words[] = {"via", "dev", "metric", "default", "unreachable", "nexthop", "10.0.0.0/8",
                         "/", "//", "1.2.3.4/999", "-1", "mon.hb0", "\t", " ", "::/0", "fe80::1"};
  for (int round = 0; round < 20000; ++round) {
    std::string line;
    int const count = static_cast<int>(next() % 12);
    for (int i = 0; i < count; ++i) {
      if (next() % 3 == 0) {
        int const len = static_cast<int>(next() % (next() % 50 == 0 ? 1500 : 12));
        for (int k = 0; k < len; ++k) line += static_cast<char>(33 + next() % 94);
      } else {
        line += words[next() % (sizeof words / sizeof words[0])];
      }
      line += next() % 5 == 0 ? "\t" : " ";
    }
    if (next() % 2) line += "\n";
    Json::Value route(Json::objectValue);
    auto type = next() % 2 ? IPTYPE_V4 : IPTYPE_V6;
    StaticRoute::ParseRouteLine(type, line, route);
    ASSERT_TRUE(route["ip"].isString()) << line;
    ASSERT_TRUE(route["metric"].isString()) << line;
    if (type == IPTYPE_V4) {
      ASSERT_TRUE(route["mask"].isString()) << line;
    }
  }
}

}  // namespace
