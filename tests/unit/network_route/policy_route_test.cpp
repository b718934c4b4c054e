// PolicyRoute against the real kernel: veth eth0 (10.200.1.2/24, peer 10.200.1.1) and eth1
// (10.200.2.2/24), the real /sbin/ip, the registry, rt_tables and the rule files on disk.
#include "vornwireless/network/route/policy_route.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "vornwireless/utils/config.h"

using vornnetwork::network::IPTYPE_V4;
using vornnetwork::network::IPTYPE_V6;
using vornnetwork::network::PolicyRoute;
using vornnetwork::network::PolicyRouteRule;
using vorntest::LogLine;
using vorntest::ReadFile;
using vorntest::SyslogCapture;

namespace {

const std::string kDir = "/etc/iproute2/config/";
const std::string kRegistry = kDir + "multi_table_config";
const std::string kRtTables = "/etc/iproute2/rt_tables";
const char kSource[] = "network/route/policy_route.cpp";

// Lookup rules of the family that point to one of our tables, as "PRIO: from SRC lookup T".
std::vector<std::string> TableRules(bool v6 = false) {
  auto r = v6 ? vorntest::Ip({"-6", "rule", "show"}) : vorntest::Ip({"rule", "show"});
  std::vector<std::string> out;
  size_t start = 0;
  while (start < r.out.size()) {
    size_t end = r.out.find('\n', start);
    if (end == std::string::npos) end = r.out.size();
    std::string line = r.out.substr(start, end - start);
    start = end + 1;
    if (line.find("-table") == std::string::npos) continue;
    for (auto& c : line) {
      if (c == '\t') c = ' ';
    }
    while (!line.empty() && line.back() == ' ') line.pop_back();
    out.push_back(line);
  }
  return out;
}

std::string Routes(std::string const& table, bool v6 = false) {
  auto r = v6 ? vorntest::Ip({"-6", "route", "show", "table", table})
              : vorntest::Ip({"route", "show", "table", table});
  return r.out;
}

class PolicyRouteTest : public ::testing::Test {
 protected:
  void SetUp() override {
    // An empty system: no registry, no rt_tables, no rule files, no table rules or routes.
    vorntest::Run({"/bin/rm", "-rf", "/etc/iproute2/config", kRtTables, "/tmp/lock"});
    for (char const* family : {"-4", "-6"}) {
      vorntest::Ip({family, "rule", "flush"});
      vorntest::Ip({family, "rule", "add", "from", "all", "lookup", "main", "pref", "32766"});
      vorntest::Ip({family, "rule", "add", "from", "all", "lookup", "default", "pref", "32767"});
      for (int t = 1; t < 12; ++t) {
        vorntest::Ip({family, "route", "flush", "table", std::to_string(t)});
      }
    }
    vorntest::Run({"/bin/mkdir", "-p", kDir});
  }

  // A rule file of the form the management software stores.
  void WriteRuleFile(std::string const& name, std::string const& content) {
    ASSERT_TRUE(vorntest::WriteFile(kDir + name, content));
  }
};

TEST_F(PolicyRouteTest, FirstDisableOnEmptySystemCreatesRegistryAndEmptyRtTables) {
  vorntest::Run({"/bin/rm", "-rf", "/etc/iproute2/config"});
  PolicyRoute route;
  EXPECT_EQ(route.DisableTable(IPTYPE_V4, "static"), 0);
  EXPECT_EQ(ReadFile(kRegistry), "[static-table]\n\tenable=no\n\tid=2\n\tsource=\n");
  EXPECT_TRUE(vorntest::Exists(kRtTables));
  EXPECT_EQ(ReadFile(kRtTables), "");

  EXPECT_EQ(route.EnableTable(IPTYPE_V4, "static", "all"), 0);
  EXPECT_EQ(ReadFile(kRtTables), "2 static-table\n");
  EXPECT_EQ(ReadFile(kRegistry), "[static-table]\n\tenable=yes\n\tid=2\n\tsource=all\n");
  EXPECT_EQ(TableRules(), std::vector<std::string>{"2: from all lookup static-table"});
  // The lock file is gone once the lock is released.
  EXPECT_FALSE(vorntest::Exists("/tmp/lock/lock_rt_tables"));
}

TEST_F(PolicyRouteTest, StartUpSequenceTwiceLeavesOneStaticRulePerFamily) {
  for (int run = 0; run < 3; ++run) {
    PolicyRoute route;
    EXPECT_EQ(route.DisableTable(IPTYPE_V4, "static"), 0);
    EXPECT_EQ(route.DisableTable(IPTYPE_V6, "static"), 0);
    EXPECT_EQ(route.EnableTable(IPTYPE_V4, "static", "all"), 0);
    EXPECT_EQ(route.EnableTable(IPTYPE_V6, "static", "all"), 0);
  }
  EXPECT_EQ(ReadFile(kRegistry),
            "[static-table]\n\tenable=yes\n\tenable_v6=yes\n\tid=2\n\tsource=all\n"
            "\tsource_v6=all\n");
  EXPECT_EQ(ReadFile(kRtTables), "2 static-table\n");
  EXPECT_EQ(TableRules(false), std::vector<std::string>{"2: from all lookup static-table"});
  EXPECT_EQ(TableRules(true), std::vector<std::string>{"2: from all lookup static-table"});
}

TEST_F(PolicyRouteTest, EnablingInterfaceWithoutRuleFileEndsWithZeroAndAddsNoSection) {
  PolicyRoute route;
  ASSERT_EQ(route.EnableTable(IPTYPE_V4, "static", "all"), 0);
  std::string const before = ReadFile(kRegistry);
  EXPECT_EQ(route.EnableTable(IPTYPE_V4, "eth0", "10.1.0.0/24"), 0);
  EXPECT_EQ(ReadFile(kRegistry), before);
  EXPECT_EQ(ReadFile(kRtTables), "2 static-table\n");
  EXPECT_EQ(TableRules(), std::vector<std::string>{"2: from all lookup static-table"});
}

TEST_F(PolicyRouteTest, EmptyRuleFileKeepsTheTableOff) {
  WriteRuleFile("eth0-table-rule", "");
  PolicyRoute route;
  EXPECT_EQ(route.EnableTable(IPTYPE_V4, "eth0", "10.1.0.0/24"), 0);
  EXPECT_FALSE(vorntest::Exists(kRegistry));
}

TEST_F(PolicyRouteTest, NewTableGetsHighestNumberPlusOne) {
  ASSERT_TRUE(vorntest::WriteFile(kRegistry,
                                  "[eth0-table]\n\tenable=yes\n\tid=3\n\tsource=10.1.0.0/24\n"
                                  "[static-table]\n\tenable=yes\n\tid=2\n\tsource=all\n"));
  WriteRuleFile("eth1-table-rule", "[r]\n\tifname=eth1\n\tip=\n\tmask=\n\tgateway=10.200.2.1\n");
  PolicyRoute route;
  ASSERT_EQ(route.EnableTable(IPTYPE_V4, "eth1", "10.3.0.0/24"), 0);
  EXPECT_EQ(route.GetMaxID(), 4);
  EXPECT_EQ(ReadFile(kRegistry),
            "[eth0-table]\n\tenable=yes\n\tid=3\n\tsource=10.1.0.0/24\n"
            "[eth1-table]\n\tenable=yes\n\tid=4\n\tsource=10.3.0.0/24\n"
            "[static-table]\n\tenable=yes\n\tid=2\n\tsource=all\n");
  EXPECT_EQ(ReadFile(kRtTables), "3 eth0-table\n4 eth1-table\n2 static-table\n");
  EXPECT_EQ(TableRules(), std::vector<std::string>{"4: from 10.3.0.0/24 lookup eth1-table"});
  EXPECT_EQ(Routes("eth1-table"), "default via 10.200.2.1 dev eth1 \n");
}

TEST_F(PolicyRouteTest, EmptyRegistryFileStartsNumbersAtOne) {
  ASSERT_TRUE(vorntest::WriteFile(kRegistry, ""));
  WriteRuleFile("eth0-table-rule", "[r]\n\tifname=eth0\n\tgateway=10.200.1.1\n");
  PolicyRoute route;
  ASSERT_EQ(route.EnableTable(IPTYPE_V4, "eth0", "all"), 0);
  EXPECT_EQ(ReadFile(kRtTables), "1 eth0-table\n");
}

TEST_F(PolicyRouteTest, InterfaceTableWithTwoSourcesGetsTwoRulesAtOnePriorityAndItsRoutes) {
  PolicyRoute route;
  ASSERT_EQ(route.EnableTable(IPTYPE_V4, "static", "all"), 0);
  WriteRuleFile("eth0-table-rule",
                "[net]\n\tifname=eth0\n\tip=10.9.0.0\n\tmask=255.255.0.0\n\tgateway=10.200.1.1\n"
                "[def]\n\tifname=eth0\n\tgateway=10.200.1.1\n");
  ASSERT_EQ(route.EnableTable(IPTYPE_V4, "eth0", "10.1.0.0/24,10.2.0.0/24"), 0);
  EXPECT_EQ(ReadFile(kRtTables), "3 eth0-table\n2 static-table\n");
  EXPECT_EQ(ReadFile(kRegistry),
            "[eth0-table]\n\tenable=yes\n\tid=3\n\tsource=10.1.0.0/24,10.2.0.0/24\n"
            "[static-table]\n\tenable=yes\n\tid=2\n\tsource=all\n");
  auto rules = TableRules();
  EXPECT_EQ(rules, (std::vector<std::string>{"2: from all lookup static-table",
                                             "3: from 10.1.0.0/24 lookup eth0-table",
                                             "3: from 10.2.0.0/24 lookup eth0-table"}));
  EXPECT_EQ(Routes("eth0-table"),
            "default via 10.200.1.1 dev eth0 \n10.9.0.0/16 via 10.200.1.1 dev eth0 \n");
}

TEST_F(PolicyRouteTest, NetworkRuleWithoutGatewayGoesOverTheDevice) {
  WriteRuleFile("eth0-table-rule", "[net]\n\tifname=eth0\n\tip=10.9.1.7\n\tmask=255.255.255.0\n");
  PolicyRoute route;
  ASSERT_EQ(route.EnableTable(IPTYPE_V4, "eth0", "all"), 0);
  EXPECT_EQ(Routes("eth0-table"), "10.9.1.0/24 dev eth0 scope link \n");
}

TEST_F(PolicyRouteTest, SectionWithoutIpMakesDefaultRouteInTheInterfaceTable) {
  WriteRuleFile("eth1-table-rule", "[only-gw]\n\tifname=eth1\n\tgateway=10.200.2.1\n");
  PolicyRoute route;
  ASSERT_EQ(route.EnableTable(IPTYPE_V4, "eth1", "10.5.0.0/16"), 0);
  EXPECT_EQ(Routes("eth1-table"), "default via 10.200.2.1 dev eth1 \n");
  EXPECT_EQ(Routes("main").find("10.5."), std::string::npos);
}

TEST_F(PolicyRouteTest, SectionWithEmptyIfnameIsSkippedAndLogged) {
  SyslogCapture log;
  WriteRuleFile("eth0-table-rule",
                "[a]\n\tifname=\n\tgateway=10.200.1.1\n[b]\n\tifname=eth0\n\tip=10.7.0.0\n"
                "\tmask=255.255.0.0\n\tgateway=10.200.1.1\n");
  PolicyRoute route;
  ASSERT_EQ(route.EnableTable(IPTYPE_V4, "eth0", "all"), 0);
  EXPECT_EQ(Routes("eth0-table"), "10.7.0.0/16 via 10.200.1.1 dev eth0 \n");
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSource, "Wrong parameter."))) << log.Dump();
}

TEST_F(PolicyRouteTest, DisablingIPv4OfTableOnForIPv6KeepsItsRtTablesLine) {
  vorntest::IpOk({"-6", "addr", "add", "2001:db8:1::2/64", "dev", "eth0", "nodad"});
  WriteRuleFile("eth0-table-rule", "[d]\n\tifname=eth0\n\tgateway=10.200.1.1\n");
  WriteRuleFile("eth0-table-rule-v6", "[d]\n\tifname=eth0\n\tgateway=2001:db8:1::1\n");
  PolicyRoute route;
  ASSERT_EQ(route.EnableTable(IPTYPE_V4, "eth0", "10.1.0.0/24"), 0);
  ASSERT_EQ(route.EnableTable(IPTYPE_V6, "eth0", "2001:db8:9::/48"), 0);
  EXPECT_NE(Routes("eth0-table", true).find("default via 2001:db8:1::1 dev eth0"),
            std::string::npos);
  ASSERT_EQ(route.DisableTable(IPTYPE_V4, "eth0"), 0);
  EXPECT_EQ(ReadFile(kRtTables), "3 eth0-table\n");
  EXPECT_EQ(ReadFile(kRegistry),
            "[eth0-table]\n\tenable=no\n\tenable_v6=yes\n\tid=3\n\tsource=\n"
            "\tsource_v6=2001:db8:9::/48\n");
  EXPECT_TRUE(TableRules(false).empty());
  EXPECT_EQ(Routes("eth0-table"), "");
  EXPECT_EQ(TableRules(true),
            std::vector<std::string>{"3: from 2001:db8:9::/48 lookup eth0-table"});
  // Off for both: the line goes.
  ASSERT_EQ(route.DisableTable(IPTYPE_V6, "eth0"), 0);
  EXPECT_EQ(ReadFile(kRtTables), "");
  vorntest::Ip({"-6", "addr", "del", "2001:db8:1::2/64", "dev", "eth0"});
}

TEST_F(PolicyRouteTest, EnablingTwiceWithOneSourceListsItTwiceAndKeepsOneRule) {
  WriteRuleFile("eth0-table-rule", "[d]\n\tifname=eth0\n\tgateway=10.200.1.1\n");
  PolicyRoute route;
  ASSERT_EQ(route.EnableTable(IPTYPE_V4, "eth0", "10.1.0.0/24"), 0);
  ASSERT_EQ(route.EnableTable(IPTYPE_V4, "eth0", "10.1.0.0/24"), 0);
  EXPECT_EQ(ReadFile(kRegistry),
            "[eth0-table]\n\tenable=yes\n\tid=3\n\tsource=10.1.0.0/24,10.1.0.0/24\n");
  EXPECT_EQ(TableRules(), std::vector<std::string>{"3: from 10.1.0.0/24 lookup eth0-table"});
}

TEST_F(PolicyRouteTest, BadSourcesAreRefusedBeforeAnythingChanges) {
  WriteRuleFile("eth0-table-rule", "[d]\n\tifname=eth0\n\tgateway=10.200.1.1\n");
  PolicyRoute route;
  ASSERT_EQ(route.EnableTable(IPTYPE_V4, "static", "all"), 0);
  std::string const registry = ReadFile(kRegistry);
  SyslogCapture log;
  for (std::string source : {",,", "10.0.0.0/33", "10.1.0.0/24,", "2001:db8::/64", "a b"}) {
    EXPECT_EQ(route.EnableTable(IPTYPE_V4, "eth0", source), -1) << source;
  }
  EXPECT_EQ(route.EnableTable(IPTYPE_V6, "eth0", "10.0.0.0/8"), -1);
  EXPECT_EQ(route.EnableTable(IPTYPE_V4, "eth0", ""), -1);
  EXPECT_EQ(route.EnableTable(IPTYPE_V4, "", "all"), -1);
  EXPECT_EQ(log.Matching(LogLine(kSource, "Bad parameter.")).size(), 8u) << log.Dump();
  EXPECT_EQ(ReadFile(kRegistry), registry);
  EXPECT_EQ(ReadFile(kRtTables), "2 static-table\n");
  EXPECT_EQ(TableRules(), std::vector<std::string>{"2: from all lookup static-table"});
  EXPECT_EQ(Routes("3"), "");
}

TEST_F(PolicyRouteTest, NamesThatWouldBreakTheFilesAreRefused) {
  PolicyRoute route;
  for (std::string name : {"eth]0", "eth[0", "a=b", "eth\n0", "../x", "a b"}) {
    EXPECT_EQ(route.EnableTable(IPTYPE_V4, name, "all"), -1);
    EXPECT_EQ(route.DisableTable(IPTYPE_V4, name), -1);
  }
  EXPECT_FALSE(vorntest::Exists(kRegistry));
  EXPECT_FALSE(vorntest::Exists(kRtTables));
}

TEST_F(PolicyRouteTest, AddRuleStoresTheSectionWithoutTouchingTheKernel) {
  PolicyRouteRule rule;
  rule.type = IPTYPE_V4;
  rule.ifname = "eth0";
  rule.name = "office";
  rule.ip = std::string("10.8.0.0");
  rule.mask = std::string("255.255.0.0");
  rule.gateway = std::string("10.200.1.1");
  PolicyRoute route;
  ASSERT_EQ(route.AddRule(rule), 0);
  EXPECT_EQ(ReadFile(kDir + "eth0-table-rule"),
            "[office]\n\tgateway=10.200.1.1\n\tifname=eth0\n\tip=10.8.0.0\n\tmask=255.255.0.0\n");
  EXPECT_EQ(Routes("all").find("10.8.0.0"), std::string::npos);

  PolicyRouteRule v6;
  v6.type = IPTYPE_V6;
  v6.ifname = "eth0";
  v6.name = "lab";
  v6.ip = std::string("2001:db8:5::");
  v6.prefix_length = "48";
  ASSERT_EQ(route.AddRule(v6), 0);
  EXPECT_EQ(ReadFile(kDir + "eth0-table-rule-v6"),
            "[lab]\n\tgateway=\n\tifname=eth0\n\tip=2001:db8:5::\n\tprefix_length=48\n");

  // Deleting removes the section; a missing file is fine.
  EXPECT_EQ(route.DeleteRule(IPTYPE_V4, "eth0", "office"), 0);
  EXPECT_EQ(ReadFile(kDir + "eth0-table-rule"), "");
  EXPECT_EQ(route.DeleteRule(IPTYPE_V4, "eth9", "office"), 0);
  EXPECT_FALSE(vorntest::Exists(kDir + "eth9-table-rule"));
}

TEST_F(PolicyRouteTest, SectionNamesThatWouldBreakTheFileAreRefusedAndTheFileStays) {
  PolicyRouteRule rule;
  rule.type = IPTYPE_V4;
  rule.ifname = "eth0";
  rule.name = "keep";
  rule.gateway = std::string("10.200.1.1");
  PolicyRoute route;
  ASSERT_EQ(route.AddRule(rule), 0);
  std::string const before = ReadFile(kDir + "eth0-table-rule");
  for (std::string name : {"a]b", "[x", "line\nbreak", "", "k=v"}) {
    rule.name = name;
    EXPECT_EQ(route.AddRule(rule), -1);
    EXPECT_EQ(route.DeleteRule(IPTYPE_V4, "eth0", name), -1);
  }
  rule.name = "ok";
  rule.prefix_length = "1\n2";
  rule.type = IPTYPE_V6;
  EXPECT_EQ(route.AddRule(rule), -1);
  EXPECT_EQ(ReadFile(kDir + "eth0-table-rule"), before);
  EXPECT_FALSE(vorntest::Exists(kDir + "eth0-table-rule-v6"));
}

TEST_F(PolicyRouteTest, UnknownInterfaceRoutesAreLoggedAndTheTableStillTurnsOn) {
  WriteRuleFile("nosuch0-table-rule", "[d]\n\tifname=nosuch0\n\tgateway=10.200.1.1\n");
  PolicyRoute route;
  EXPECT_EQ(route.EnableTable(IPTYPE_V4, "nosuch0", "all"), 0);
  EXPECT_EQ(ReadFile(kRtTables), "3 nosuch0-table\n");
  EXPECT_EQ(Routes("nosuch0-table"), "");
}

TEST_F(PolicyRouteTest, IsRulesEmptyResolvesNamesUnderTheConfigDirectory) {
  PolicyRoute route;
  EXPECT_TRUE(route.IsRulesEmpty("eth0-table-rule"));
  WriteRuleFile("eth0-table-rule", "[d]\n\tifname=eth0\n");
  EXPECT_FALSE(route.IsRulesEmpty("eth0-table-rule"));
  WriteRuleFile("eth1-table-rule", "");
  EXPECT_TRUE(route.IsRulesEmpty("eth1-table-rule"));
}

TEST_F(PolicyRouteTest, StaticTableGetsOnlyTheEnabledStaticRulesAndNoInterfaceTableDoes) {
  vorntest::IpOk({"-6", "addr", "add", "2001:db8:1::2/64", "dev", "eth0", "nodad"});
  WriteRuleFile("static-table-rule",
                "[0]\n\tenable=yes\n\tgateway=10.200.1.1\n\tifname=eth0\n\tip=10.20.0.0\n"
                "\tmask=255.255.0.0\n"
                "[1]\n\tenable=no\n\tgateway=10.200.1.1\n\tifname=eth0\n\tip=10.21.0.0\n"
                "\tmask=255.255.0.0\n");
  WriteRuleFile("static-table-rule-v6",
                "[0]\n\tenable=yes\n\tgateway=2001:db8:1::1\n\tifname=eth0\n"
                "\tip=2001:db8:77::\n\tprefix_length=48\n");
  PolicyRoute route;
  ASSERT_EQ(route.EnableTable(IPTYPE_V4, "static", "all"), 0);
  ASSERT_EQ(route.EnableTable(IPTYPE_V6, "static", "all"), 0);
  EXPECT_EQ(Routes("static-table"), "10.20.0.0/16 via 10.200.1.1 dev eth0 \n");
  EXPECT_NE(Routes("static-table", true).find("2001:db8:77::/48 via 2001:db8:1::1 dev eth0"),
            std::string::npos);
  EXPECT_EQ(vorntest::Ip({"route", "show", "table", "all"}).out.find("10.21.0.0"),
            std::string::npos);
  EXPECT_EQ(vorntest::Ip({"route", "show", "table", "3"}).out, "");
  // A restart: disabled, then enabled again: exactly the enabled rules, once.
  ASSERT_EQ(route.DisableTable(IPTYPE_V4, "static"), 0);
  EXPECT_EQ(Routes("2"), "");
  ASSERT_EQ(route.EnableTable(IPTYPE_V4, "static", "all"), 0);
  EXPECT_EQ(Routes("static-table"), "10.20.0.0/16 via 10.200.1.1 dev eth0 \n");
  vorntest::Ip({"-6", "addr", "del", "2001:db8:1::2/64", "dev", "eth0"});
}

TEST_F(PolicyRouteTest, ReleasingAFailedLockLeavesTheHoldersFile) {
  // Another process holds the lock file; an Unlock without a lock of ours keeps it.
  vorntest::Run({"/bin/mkdir", "-p", "/tmp/lock"});
  vornwireless::utils::FileLock mine("/tmp/lock/lock_rt_tables", true);
  ASSERT_TRUE(mine.Lock());
  vornwireless::utils::FileLock other("/tmp/lock/lock_rt_tables", true);
  EXPECT_FALSE(other.Unlock());
  EXPECT_TRUE(vorntest::Exists("/tmp/lock/lock_rt_tables"));
  EXPECT_TRUE(mine.Unlock());
  EXPECT_FALSE(vorntest::Exists("/tmp/lock/lock_rt_tables"));
}

TEST_F(PolicyRouteTest, ReleasingASharedLockKeepsTheFileWhileAnotherHolderShares) {
  vorntest::Run({"/bin/mkdir", "-p", "/tmp/lock"});
  vornwireless::utils::FileLock first("/tmp/lock/shared", false);
  vornwireless::utils::FileLock second("/tmp/lock/shared", false);
  ASSERT_TRUE(first.Lock());
  ASSERT_TRUE(second.Lock());
  EXPECT_TRUE(first.Unlock());
  EXPECT_TRUE(vorntest::Exists("/tmp/lock/shared"));
  EXPECT_TRUE(second.Unlock());
  EXPECT_FALSE(vorntest::Exists("/tmp/lock/shared"));
}

}  // namespace
