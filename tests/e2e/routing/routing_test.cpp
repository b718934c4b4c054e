// Routing tables end to end: the real vornnetd (whose start rebuilds the static table's rules),
// vornnetdtool and gdbus as clients, the real kernel and /sbin/ip, with two uplinks (veth eth0
// 10.200.1.2/24 with peer 10.200.1.1, eth1 10.200.2.2/24 with peer 10.200.2.1).
#include <gtest/gtest.h>
#include <json/json.h>
#include <signal.h>
#include <unistd.h>

#include <memory>
#include <string>
#include <vector>

#include "support/daemon_process.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "vornplatform/lock.h"

namespace {

using vorntest::DaemonProcess;
using vorntest::LogLine;
using vorntest::ReadFile;
using vorntest::RunResult;
using vorntest::SyslogCapture;

const std::string kDir = "/etc/iproute2/config/";
const std::string kRegistry = kDir + "multi_table_config";
const std::string kRtTables = "/etc/iproute2/rt_tables";
const std::string kLock = "/tmp/lock/lock_rt_tables";

RunResult Tool(std::vector<std::string> args, std::string const& input = "") {
  args.insert(args.begin(), VORNNETDTOOL);
  return vorntest::Run(args, input, 60);
}

RunResult Call(const std::string& method, const std::string& json) {
  return vorntest::Run({"/usr/bin/gdbus", "call", "--session", "--dest", "com.vornlink.net",
                        "--object-path", "/", "--method", "com.vornlink.net." + method, json});
}

// The lines of `ip [-6] rule show` that look up one of our tables, blanks normalised.
std::vector<std::string> TableRules(bool v6 = false) {
  RunResult r = v6 ? vorntest::Ip({"-6", "rule", "show"}) : vorntest::Ip({"rule", "show"});
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
  return (v6 ? vorntest::Ip({"-6", "route", "show", "table", table})
             : vorntest::Ip({"route", "show", "table", table}))
      .out;
}

Json::Value Parse(std::string const& text) {
  Json::Value value;
  Json::Reader().parse(text, value);
  return value;
}

std::string StaticSection(int i, bool enable, std::string const& gateway,
                          std::string const& ifname, std::string const& ip,
                          std::string const& mask) {
  return "[" + std::to_string(i) + "]\n\tenable=" + (enable ? "yes" : "no") +
         "\n\tgateway=" + gateway + "\n\tifname=" + ifname + "\n\tip=" + ip + "\n\tmask=" +
         mask + "\n";
}

class Routing : public testing::Test {
 protected:
  // Each test starts from an empty system: no routing files, no table rules or routes.
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    vorntest::Run({"/bin/rm", "-rf", "/etc/iproute2/config", kRtTables, "/tmp/lock"});
    for (char const* family : {"-4", "-6"}) {
      vorntest::Ip({family, "rule", "flush"});
      vorntest::Ip({family, "rule", "add", "from", "all", "lookup", "main", "pref", "32766"});
      vorntest::Ip({family, "rule", "add", "from", "all", "lookup", "default", "pref", "32767"});
      for (int t = 1; t < 12; ++t) {
        vorntest::Ip({family, "route", "flush", "table", std::to_string(t)});
      }
    }
    vorntest::Ip({"-6", "addr", "add", "2001:db8:1::2/64", "dev", "eth0", "nodad"});
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
    // The modules have started once the route module answers.
    ASSERT_EQ(0, Call("GetGatewayListData", R"({"type": "GTYPE_V4"})").status);
  }
  void Restart() {
    ASSERT_EQ(0, daemon_->Stop(SIGTERM));
    daemon_.reset();
    StartDaemon();
  }
  std::unique_ptr<DaemonProcess> daemon_;
};

TEST_F(Routing, FirstStartWritesRegistryAndOneStaticRulePerFamilyThatRestartsKeep) {
  EXPECT_EQ(ReadFile(kRegistry),
            "[static-table]\n\tenable=yes\n\tenable_v6=yes\n\tid=2\n\tsource=all\n"
            "\tsource_v6=all\n");
  EXPECT_EQ(ReadFile(kRtTables), "2 static-table\n");
  EXPECT_EQ(TableRules(false), std::vector<std::string>{"2: from all lookup static-table"});
  EXPECT_EQ(TableRules(true), std::vector<std::string>{"2: from all lookup static-table"});
  Restart();
  Restart();
  EXPECT_EQ(TableRules(false), std::vector<std::string>{"2: from all lookup static-table"});
  EXPECT_EQ(TableRules(true), std::vector<std::string>{"2: from all lookup static-table"});
  EXPECT_EQ(ReadFile(kRtTables), "2 static-table\n");
  EXPECT_FALSE(vorntest::Exists(kLock));
}

TEST_F(Routing, InterfaceTableWithTwoSourcesThroughTheTool) {
  RunResult r = Tool({"route", "add-rule", "-4", "--ifname", "eth0", "--name", "net", "--ip",
                      "10.9.0.0", "--mask", "255.255.0.0", "--gateway", "10.200.1.1"});
  ASSERT_EQ(0, r.status) << r.err;
  r = Tool({"route", "add-rule", "-4",
            R"({"ifname": "eth0", "name": "def", "gateway": "10.200.1.1"})"});
  ASSERT_EQ(0, r.status) << r.err;
  EXPECT_EQ(ReadFile(kDir + "eth0-table-rule"),
            "[def]\n\tgateway=10.200.1.1\n\tifname=eth0\n\tip=\n\tmask=\n"
            "[net]\n\tgateway=10.200.1.1\n\tifname=eth0\n\tip=10.9.0.0\n\tmask=255.255.0.0\n");
  r = Tool({"route", "enable-table", "-4", "eth0", "10.1.0.0/24,10.2.0.0/24"});
  ASSERT_EQ(0, r.status) << r.err;
  EXPECT_EQ(ReadFile(kRtTables), "3 eth0-table\n2 static-table\n");
  EXPECT_EQ(TableRules(), (std::vector<std::string>{"2: from all lookup static-table",
                                                    "3: from 10.1.0.0/24 lookup eth0-table",
                                                    "3: from 10.2.0.0/24 lookup eth0-table"}));
  EXPECT_EQ(Routes("eth0-table"),
            "default via 10.200.1.1 dev eth0 \n10.9.0.0/16 via 10.200.1.1 dev eth0 \n");

  // IPv6 on as well, then IPv4 off: the rt_tables line stays.
  r = Tool({"route", "add-rule", "-6", "--ifname", "eth0", "--name", "def", "--gateway",
            "2001:db8:1::1"});
  ASSERT_EQ(0, r.status) << r.err;
  ASSERT_EQ(0, Tool({"route", "enable-table", "-6", "eth0", "2001:db8:9::/48"}).status);
  r = Tool({"--disable-route-table", "-4", "eth0"});
  ASSERT_EQ(0, r.status) << r.err;
  EXPECT_EQ(ReadFile(kRtTables), "3 eth0-table\n2 static-table\n");
  EXPECT_EQ(TableRules(), std::vector<std::string>{"2: from all lookup static-table"});
  EXPECT_EQ(Routes("eth0-table"), "");
  EXPECT_EQ(TableRules(true), (std::vector<std::string>{"2: from all lookup static-table",
                                                        "3: from 2001:db8:9::/48 lookup eth0-table"}));
  // The rule deletion other programs run.
  r = Tool({"--del-policy-route-rule", "-4", "eth0", "net"});
  ASSERT_EQ(0, r.status) << r.err;
  EXPECT_EQ(ReadFile(kDir + "eth0-table-rule"),
            "[def]\n\tgateway=10.200.1.1\n\tifname=eth0\n\tip=\n\tmask=\n");
}

TEST_F(Routing, ElevenStaticRulesThroughTheToolComeBackAfterARestart) {
  std::string const rules = R"([
    {"ifname": "eth0", "ip": "10.30.0.0", "mask": "255.255.0.0", "gateway": "10.200.1.1", "enable": true},
    {"ifname": "eth0", "ip": "10.31.0.5", "mask": "255.255.255.255", "gateway": "10.200.1.1", "enable": true},
    {"ifname": "eth0", "ip": "10.32.0.0", "mask": "255.255.255.0", "gateway": "10.200.1.1", "enable": false},
    {"ifname": "eth0", "ip": "10.33.0.0", "mask": "255.255.0.0", "gateway": "192.168.99.1", "enable": true},
    {"ifname": "eth1", "ip": "10.34.0.0", "mask": "255.255.0.0", "gateway": "10.200.2.1", "enable": true},
    {"ifname": "eth1", "ip": "10.35.0.0", "mask": "255.255.0.0", "gateway": "10.200.2.1", "enable": true},
    {"ifname": "eth1", "ip": "10.36.0.0", "mask": "255.255.0.0", "gateway": "10.200.2.1", "enable": true},
    {"ifname": "eth1", "ip": "10.37.0.0", "mask": "255.255.0.0", "gateway": "10.200.2.1", "enable": true},
    {"ifname": "eth0", "ip": "10.38.0.0", "mask": "255.255.0.0", "gateway": "10.200.1.1", "enable": true},
    {"ifname": "eth0", "ip": "10.39.0.0", "mask": "255.255.0.0", "gateway": "10.200.1.1", "enable": true},
    {"ifname": "eth0", "ip": "10.40.0.0", "mask": "255.255.0.0", "gateway": "10.200.1.1", "enable": true}
  ])";
  RunResult r = Tool({"route", "set-static", "-4", "-"}, rules);
  ASSERT_EQ(0, r.status) << r.err;
  EXPECT_EQ(ReadFile(kDir + "static-table-rule"),
            StaticSection(0, true, "10.200.1.1", "eth0", "10.30.0.0", "255.255.0.0") +
                StaticSection(1, true, "10.200.1.1", "eth0", "10.31.0.5", "255.255.255.255") +
                StaticSection(10, true, "10.200.1.1", "eth0", "10.40.0.0", "255.255.0.0") +
                StaticSection(2, false, "10.200.1.1", "eth0", "10.32.0.0", "255.255.255.0") +
                StaticSection(3, true, "192.168.99.1", "eth0", "10.33.0.0", "255.255.0.0") +
                StaticSection(4, true, "10.200.2.1", "eth1", "10.34.0.0", "255.255.0.0") +
                StaticSection(5, true, "10.200.2.1", "eth1", "10.35.0.0", "255.255.0.0") +
                StaticSection(6, true, "10.200.2.1", "eth1", "10.36.0.0", "255.255.0.0") +
                StaticSection(7, true, "10.200.2.1", "eth1", "10.37.0.0", "255.255.0.0") +
                StaticSection(8, true, "10.200.1.1", "eth0", "10.38.0.0", "255.255.0.0") +
                StaticSection(9, true, "10.200.1.1", "eth0", "10.39.0.0", "255.255.0.0"));
  std::string const expected =
      "10.30.0.0/16 via 10.200.1.1 dev eth0 \n"
      "10.31.0.5 via 10.200.1.1 dev eth0 \n"
      "10.34.0.0/16 via 10.200.2.1 dev eth1 \n"
      "10.35.0.0/16 via 10.200.2.1 dev eth1 \n"
      "10.36.0.0/16 via 10.200.2.1 dev eth1 \n"
      "10.37.0.0/16 via 10.200.2.1 dev eth1 \n"
      "10.38.0.0/16 via 10.200.1.1 dev eth0 \n"
      "10.39.0.0/16 via 10.200.1.1 dev eth0 \n"
      "10.40.0.0/16 via 10.200.1.1 dev eth0 \n";
  EXPECT_EQ(Routes("static-table"), expected);

  r = Tool({"route", "get-static", "-4"});
  ASSERT_EQ(0, r.status) << r.err;
  Json::Value got = Parse(r.out);
  ASSERT_EQ(got.size(), 11u) << r.out;
  std::string active;
  for (auto const& rule : got) active += rule["active"].asString().substr(0, 1);
  // Sections 0, 1, 10, 2 (off), 3 (unreachable gateway), 4 ... 9.
  EXPECT_EQ(active, "EEEDDEEEEEE");

  // IPv6: a host route, an address with host bits (added as its network, reported inactive),
  // a network and a disabled rule.
  r = Tool({"route", "set-static", "-6",
            R"([{"ifname": "eth0", "ip": "2001:db8:51::7", "mask": "128",
                 "gateway": "2001:db8:1::1", "enable": true},
                {"ifname": "eth0", "ip": "2001:db8:52::9", "mask": "64",
                 "gateway": "2001:db8:1::1", "enable": true},
                {"ifname": "eth0", "ip": "2001:db8:50::", "mask": "48",
                 "gateway": "2001:db8:1::1", "enable": true},
                {"ifname": "eth0", "ip": "2001:db8:53::", "mask": "48",
                 "gateway": "2001:db8:1::1", "enable": false}])"});
  ASSERT_EQ(0, r.status) << r.err;
  r = Tool({"route", "get-static", "-6"});
  got = Parse(r.out);
  active.clear();
  for (auto const& rule : got) active += rule["active"].asString().substr(0, 1);
  EXPECT_EQ(active, "EDED") << r.out;
  std::string const expected6 = Routes("static-table", true);
  EXPECT_NE(expected6.find("2001:db8:52::/64 via 2001:db8:1::1 dev eth0"), std::string::npos);
  EXPECT_EQ(expected6.find("2001:db8:53::"), std::string::npos);

  // The table emptied by hand, then a daemon restart: the enabled rules are back, in no other
  // table.
  vorntest::Ip({"route", "flush", "table", "static-table"});
  vorntest::Ip({"-6", "route", "flush", "table", "static-table"});
  ASSERT_EQ(Routes("static-table"), "");
  Restart();
  EXPECT_EQ(Routes("static-table"), expected);
  EXPECT_EQ(Routes("static-table", true), expected6);
  std::string const all = vorntest::Ip({"route", "show", "table", "all"}).out;
  size_t start = 0;
  int gatewayRoutes = 0;
  while (start < all.size()) {
    size_t end = all.find('\n', start);
    if (end == std::string::npos) end = all.size();
    std::string const line = all.substr(start, end - start);
    start = end + 1;
    if (line.find(" via 10.200.") == std::string::npos) continue;
    ++gatewayRoutes;
    EXPECT_NE(line.find("table static-table"), std::string::npos) << line;
  }
  EXPECT_EQ(gatewayRoutes, 9) << all;
}

TEST_F(Routing, RouteTablesAreSortedByIdWithMainLastAndTakeTheDaemonsClass) {
  ASSERT_EQ(0, Call("AddGatewayData", R"({"type": "GTYPE_V4", "ifname": "eth0", "priority": -1,
                                          "gateway": "10.200.1.1", "class": "wan"})").status);
  ASSERT_EQ(0, Call("AddGatewayData", R"({"type": "GTYPE_V6", "ifname": "eth1", "priority": -1,
                                          "gateway": "::", "class": "lan"})").status);
  ASSERT_EQ(0, Call("AddGatewayData", R"({"type": "GTYPE_V4", "ifname": "lan", "priority": -1,
                                          "class": "bridge"})").status);
  // eth1 first (number 3), then eth0 (4); "lan-x" asks for interface lan; eth9 is unknown to the
  // daemon and is left out.
  ASSERT_TRUE(vorntest::WriteFile(kDir + "eth1-table-rule",
                                  "[d]\n\tifname=eth1\n\tgateway=10.200.2.1\n"));
  ASSERT_TRUE(vorntest::WriteFile(kDir + "eth0-table-rule",
                                  "[d]\n\tifname=eth0\n\tgateway=10.200.1.1\n"));
  ASSERT_TRUE(vorntest::WriteFile(kDir + "lan-x-table-rule", "[d]\n\tifname=\n"));
  ASSERT_TRUE(vorntest::WriteFile(kDir + "eth9-table-rule", "[d]\n\tifname=\n"));
  for (char const* name : {"eth1", "eth0", "lan-x", "eth9"}) {
    ASSERT_EQ(0, Tool({"route", "enable-table", "-4", name, "all"}).status) << name;
  }
  EXPECT_EQ(ReadFile(kRtTables), "4 eth0-table\n3 eth1-table\n6 eth9-table\n5 lan-x-table\n"
                                 "2 static-table\n");
  RunResult r = Tool({"route", "enabled-tables"});
  ASSERT_EQ(0, r.status) << r.err;
  Json::Value enabled = Parse(r.out);
  ASSERT_EQ(enabled.size(), 4u) << r.out;
  EXPECT_EQ(enabled[0]["name"], Json::Value("eth0-table"));
  EXPECT_EQ(enabled[0]["id"], Json::Value("4"));

  r = Tool({"route", "tables", "-4"});
  ASSERT_EQ(0, r.status) << r.err;
  Json::Value tables = Parse(r.out);
  ASSERT_EQ(tables.size(), 5u) << r.out;
  EXPECT_EQ(tables[3]["rules"], Json::Value(Json::arrayValue));
  std::vector<std::string> names, classes;
  for (auto const& t : tables) {
    names.push_back(t["name"].asString());
    classes.push_back(t["class"].asString());
  }
  EXPECT_EQ(names, (std::vector<std::string>{"static-table", "eth1-table", "eth0-table",
                                             "lan-x-table", "main"}));
  EXPECT_EQ(classes, (std::vector<std::string>{"unknown", "lan", "wan", "bridge", "unknown"}));
  ASSERT_EQ(tables[2]["rules"].size(), 1u);
  EXPECT_EQ(tables[2]["rules"][0]["ip"], Json::Value("default"));
  EXPECT_EQ(tables[2]["rules"][0]["mask"], Json::Value("0.0.0.0"));
  EXPECT_EQ(tables[2]["rules"][0]["gateway"], Json::Value("10.200.1.1"));
  EXPECT_EQ(tables[2]["rules"][0]["ifname"], Json::Value("eth0"));
  EXPECT_EQ(tables[2]["rules"][0]["metric"], Json::Value("0"));
  // main holds the connected networks, over their devices.
  bool connected = false;
  for (auto const& rule : tables[4]["rules"]) {
    connected = connected || (rule["ip"] == Json::Value("10.200.1.0") &&
                              rule["mask"] == Json::Value("255.255.255.0") &&
                              rule["gateway"] == Json::Value("0.0.0.0") &&
                              rule["ifname"] == Json::Value("eth0"));
  }
  EXPECT_TRUE(connected) << tables[4].toStyledString();

  r = Tool({"route", "table", "-4", "lan-x-table"});
  ASSERT_EQ(0, r.status) << r.err;
  EXPECT_EQ(Parse(r.out)["class"], Json::Value("bridge"));
  EXPECT_EQ(Parse(r.out)["rules"], Json::Value(Json::arrayValue));
}

TEST_F(Routing, LockHeldByAnotherProcessForAllThirtyTriesFailsAndLeavesItsFile) {
  std::string const registry = ReadFile(kRegistry);
  vorntest::Run({"/bin/mkdir", "-p", "/tmp/lock"});
  int fd = -1;
  ASSERT_EQ(1, VLIBCFileLockByFile(kLock.c_str(), 1, &fd));
  SyslogCapture log;
  RunResult r = vorntest::Run({vorntest::SourceDir() + "/tests/sandbox/vorn-timewarp", "20",
                               "--", VORNNETDTOOL, "route", "enable-table", "-4", "static",
                               "10.0.0.0/8"},
                              "", 120);
  EXPECT_EQ(1, r.status) << r.out << r.err;
  r = vorntest::Run({vorntest::SourceDir() + "/tests/sandbox/vorn-timewarp", "20", "--",
                     VORNNETDTOOL, "--disable-route-table", "-4", "static"},
                    "", 120);
  EXPECT_EQ(1, r.status) << r.out << r.err;
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("network/route/policy_route.cpp",
                                           "Failed to lock in EnableTable")))
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("network/route/policy_route.cpp",
                                           "Failed to lock in DisableTable")))
      << log.Dump();
  EXPECT_EQ(log.Matching("Failed to get file lock of \\[/tmp/lock/lock_rt_tables\\]").size(), 2u);
  // The holder's file is still there and still ours; nothing changed.
  EXPECT_TRUE(vorntest::Exists(kLock));
  int other = -1;
  EXPECT_EQ(0, VLIBCFileLockByFile(kLock.c_str(), 1, &other));
  EXPECT_EQ(ReadFile(kRegistry), registry);
  EXPECT_EQ(TableRules(), std::vector<std::string>{"2: from all lookup static-table"});
  EXPECT_EQ(1, VLIBCFileUnlockByFile(fd));
  // Released: the tool gets the lock at once.
  r = Tool({"route", "enable-table", "-4", "static", "all"});
  EXPECT_EQ(0, r.status) << r.err;
}

TEST_F(Routing, BadInputThroughTheToolIsRefusedAndChangesNothing) {
  ASSERT_EQ(0, Tool({"route", "add-rule", "-4", "--ifname", "eth0", "--name", "def",
                     "--gateway", "10.200.1.1"}).status);
  ASSERT_EQ(0, Tool({"route", "set-static", "-4",
                     R"([{"ifname": "eth0", "ip": "10.30.0.0", "mask": "255.255.0.0",
                          "gateway": "10.200.1.1", "enable": true}])"}).status);
  std::string const registry = ReadFile(kRegistry), rtTables = ReadFile(kRtTables),
                    rules = ReadFile(kDir + "eth0-table-rule"),
                    statics = ReadFile(kDir + "static-table-rule"),
                    staticRoutes = Routes("static-table");
  std::vector<std::vector<std::string>> bad = {
      {"route", "enable-table", "-4", "eth0", ",,"},
      {"route", "enable-table", "-4", "eth0", "10.0.0.0/33"},
      {"route", "enable-table", "-5", "eth0", "all"},
      {"route", "enable-table", "-4", "eth]0", "all"},
      {"route", "add-rule", "-4", "--ifname", "eth0", "--name", "a]b", "--gateway", "1.1.1.1"},
      {"route", "add-rule", "-4", "--ifname", "eth0", "--name", "a\nb", "--gateway", "1.1.1.1"},
      {"route", "del-rule", "-4", "eth0", "[def"},
      {"route", "set-static", "-4",
       R"([{"ifname": "eth0", "ip": "10.31.0.0", "mask": "255.255.0.0", "enable": "yes"}])"},
      {"route", "set-static", "-4", R"({"ifname": "eth0"})"},
      {"route", "set-static", "-4", "[{"},
      {"route", "test-static", "-4",
       R"({"ifname": "eth0", "ip": "10.31.0.0", "mask": "255.0.255.0", "gateway": "10.200.1.1"})"},
      {"route", "test-static", "-4",
       R"({"ifname": "nosuch0", "ip": "10.31.0.0", "mask": "255.255.0.0", "gateway": "10.200.1.1"})"},
      {"route", "nonsense"},
      {"--disable-route-table", "-4"},
  };
  for (auto const& args : bad) {
    RunResult r = Tool(args);
    EXPECT_EQ(1, r.status) << args.back() << r.out;
    EXPECT_FALSE(r.err.empty()) << args.back();
    EXPECT_EQ(ReadFile(kRegistry), registry) << args.back();
    EXPECT_EQ(ReadFile(kRtTables), rtTables) << args.back();
    EXPECT_EQ(ReadFile(kDir + "eth0-table-rule"), rules) << args.back();
    EXPECT_EQ(ReadFile(kDir + "static-table-rule"), statics) << args.back();
    EXPECT_EQ(Routes("static-table"), staticRoutes) << args.back();
  }
  // IPv6 prefixes "abc" and 129 are kept in the file and stay inactive.
  RunResult r = Tool({"route", "set-static", "-6",
                      R"([{"ifname": "eth0", "ip": "2001:db8:5::", "mask": "abc",
                           "gateway": "2001:db8:1::1", "enable": true},
                          {"ifname": "eth0", "ip": "2001:db8:6::", "mask": "129",
                           "gateway": "2001:db8:1::1", "enable": true}])"});
  ASSERT_EQ(0, r.status) << r.err;
  r = Tool({"route", "get-static", "-6"});
  Json::Value got = Parse(r.out);
  ASSERT_EQ(got.size(), 2u) << r.out;
  EXPECT_EQ(got[0]["active"], Json::Value("Disabled"));
  EXPECT_EQ(got[1]["mask"], Json::Value("129"));
  EXPECT_EQ(got[1]["active"], Json::Value("Disabled"));
  EXPECT_TRUE(daemon_->running());
}

TEST_F(Routing, HelpShowsTheRoutingCommandsWithExamples) {
  RunResult r = Tool({"--help"});
  ASSERT_EQ(0, r.status);
  for (char const* text : {"--del-policy-route-rule FAMILY NAME SECTION",
                           "--disable-route-table FAMILY NAME", "route set-static FAMILY",
                           "vornnetdtool route enable-table -4 eth0 10.1.0.0/24,10.2.0.0/24"}) {
    EXPECT_NE(r.out.find(text), std::string::npos) << text;
  }
}

}  // namespace
