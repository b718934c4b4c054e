// vornnetdtool: the requests its commands and flags build (read back from recording modules
// behind the real NetServer), its exit status and its stderr, and the form other programs call,
// `--refresh-gateway all`, against the real vornnetd.
#include <gtest/gtest.h>
#include <signal.h>

#include <memory>
#include <string>
#include <vector>

#include "support/daemon_process.h"
#include "support/test_util.h"
#include "vornwireless/dbus_net/net_client.h"

#pragma GCC diagnostic ignored "-Wdeprecated-declarations"

namespace {

using vorntest::DaemonProcess;
using vorntest::Run;
using vorntest::RunResult;

RunResult Tool(std::vector<std::string> args) {
  args.insert(args.begin(), VORNNETDTOOL);
  return Run(args, "", 30);
}

Json::Value ParseJson(std::string const& text) {
  Json::Reader reader;
  Json::Value v;
  EXPECT_TRUE(reader.parse(text, v)) << text;
  return v;
}

class ToolAgainstRecorder : public testing::Test {
 protected:
  void SetUp() override { ASSERT_TRUE(service_.ready()); }
  // What the route (3) or device list (4) module got last, before the probe itself.
  Json::Value Last(int module) {
    vornnetwork::dbus::NetClient client;
    Json::Value result;
    if (module == 4) {
      EXPECT_EQ(0, client.GetDeviceListData("probe", result));
    } else {
      Json::Value probe(Json::objectValue);
      probe["type"] = "probe";
      EXPECT_EQ(0, client.GetGatewayListData(probe, result));
    }
    return result["last"];
  }
  DaemonProcess service_{{VORN_TEST_NET_SERVICE}, "com.vornlink.net"};
};

TEST_F(ToolAgainstRecorder, HelpIsOnStdout) {
  RunResult r = Tool({"--help"});
  EXPECT_EQ(0, r.status);
  EXPECT_EQ(0u, r.out.find("usage: vornnetdtool COMMAND [ARGS]\n"));
  EXPECT_NE(std::string::npos, r.out.find("--refresh-gateway TYPE"));
  EXPECT_EQ("", r.err);
}

TEST_F(ToolAgainstRecorder, RefreshGatewayAsOtherProgramsCallIt) {
  RunResult r = Tool({"--refresh-gateway", "all"});
  EXPECT_EQ(0, r.status) << r.err;
  EXPECT_EQ("", r.out);
  EXPECT_EQ("", r.err);
  EXPECT_EQ(ParseJson(R"({"method": "REFRESH_GATEWAY", "type": "ALL"})"), Last(3));
  EXPECT_EQ(0, Tool({"--refresh-gateway", "v6"}).status);
  EXPECT_EQ(ParseJson(R"({"method": "REFRESH_GATEWAY", "type": "GTYPE_V6"})"), Last(3));
}

TEST_F(ToolAgainstRecorder, GatewayCommandsBuildTheirRequestsFromFlags) {
  struct Case {
    std::vector<std::string> args;
    const char* request;
  };
  const Case cases[] = {
      {{"gateway", "add", "--ifname", "eth0", "--type", "v4", "--priority", "0", "--gateway",
        "10.0.0.1", "--dns", "10.0.0.53", "--class", "ethernet"},
       R"({"method": "ADD_GATEWAY_DATA", "type": "GTYPE_V4", "ifname": "eth0", "priority": 0,
           "gateway": "10.0.0.1", "dns": "10.0.0.53", "class": "ethernet"})"},
      {{"gateway", "add", "--ifname", "ppp0"},
       R"({"method": "ADD_GATEWAY_DATA", "type": "GTYPE_V4", "ifname": "ppp0", "priority": -1,
           "gateway": "NULL", "dns": "NULL", "class": "NULL"})"},
      {{"gateway", "del", "eth0", "--type", "v6"},
       R"({"method": "DEL_GATEWAY_DATA", "type": "GTYPE_V6", "ifname": "eth0"})"},
      {{"gateway", "set-slave", "--ifname", "eth1", "--slave", "true"},
       R"({"method": "SET_SLAVE_DATA", "type": "GTYPE_V4", "ifname": "eth1", "slave": true})"},
      {{"gateway", "copy", "--from", "eth0", "--to", "br0", "--delete-source"},
       R"({"method": "COPY_GATEWAY_DATA", "type": "GTYPE_V4", "interface_source": "eth0",
           "interface_destination": "br0", "interface_source_delete": true})"},
      {{"gateway", "refresh"}, R"({"method": "REFRESH_GATEWAY", "type": "ALL"})"},
      {{"gateway", "add", R"({"type": "GTYPE_V6", "ifname": "6in4-eth0", "priority": 1})"},
       R"({"method": "ADD_GATEWAY_DATA", "type": "GTYPE_V6", "ifname": "6in4-eth0",
           "priority": 1})"},
  };
  for (auto const& c : cases) {
    RunResult r = Tool(c.args);
    EXPECT_EQ(0, r.status) << c.args[1] << ": " << r.err;
    EXPECT_EQ("", r.err);
    EXPECT_EQ(ParseJson(c.request), Last(3)) << c.request;
  }
}

TEST_F(ToolAgainstRecorder, QueriesPrintTheReply) {
  ASSERT_EQ(0, Tool({"gateway", "add", "--ifname", "eth0", "--priority", "4"}).status);
  RunResult get = Tool({"gateway", "get", "eth0"});
  ASSERT_EQ(0, get.status) << get.err;
  Json::Value reply = ParseJson(get.out);
  EXPECT_EQ(4, reply["priority"].asInt());
  EXPECT_EQ("GET_GATEWAY_DATA_BY_INTERFACE", reply["request"]["method"].asString());

  RunResult list = Tool({"gateway", "list", "--type", "v6"});
  ASSERT_EQ(0, list.status) << list.err;
  EXPECT_EQ(ParseJson(R"({"method": "GET_GATEWAY_LIST_DATA", "type": "GTYPE_V6"})"),
            ParseJson(list.out)["request"]);

  RunResult devices = Tool({"device", "list", "upnp"});
  ASSERT_EQ(0, devices.status) << devices.err;
  EXPECT_EQ(ParseJson(R"({"method": "get", "scannertype": "upnp"})"),
            ParseJson(devices.out)["request"]);
}

TEST_F(ToolAgainstRecorder, DeviceAndIPv6Commands) {
  RunResult set = Tool(
      {"device", "set", "--mac", "00:11:22:33:44:55", "--name", "tv", "--device-type", "media"});
  ASSERT_EQ(0, set.status) << set.err;
  EXPECT_EQ(ParseJson(R"({"method": "set", "macAddr": "00:11:22:33:44:55",
                          "userdef_displayName": "tv", "userdef_deviceType": "media"})"),
            Last(4));
  ASSERT_EQ(0, Tool({"device", "del", "00:11:22:33:44:55"}).status);
  EXPECT_EQ(ParseJson(R"({"method": "del", "macAddr": "00:11:22:33:44:55"})"), Last(4));
  EXPECT_EQ(0, Tool({"reset-ipv6", "eth0"}).status);
}

TEST_F(ToolAgainstRecorder, RefusalsAndUsageErrorsExitOneWithTheMessageOnStderr) {
  RunResult arp = Tool({"device", "list", "arp"});
  EXPECT_EQ(1, arp.status);
  EXPECT_EQ("", arp.out);
  EXPECT_EQ("vornnetdtool: device list: failed to get upnp data\n", arp.err);

  RunResult bad = Tool({"gateway", "add", R"({"type": "GTYPE_V4", "priority": "x"})"});
  EXPECT_EQ(1, bad.status);
  EXPECT_EQ("vornnetdtool: gateway add: failed to add gateway data\n", bad.err);

  const std::vector<std::vector<std::string>> usage = {
      {},
      {"frobnicate"},
      {"gateway"},
      {"gateway", "add", "--ifname", "eth0", "--priority", "high"},
      {"gateway", "add"},
      {"gateway", "get"},
      {"gateway", "list", "--type", "v5"},
      {"gateway", "set-slave", "--ifname", "eth0", "--slave", "perhaps"},
      {"gateway", "add", "{not json"},
      {"--refresh-gateway"},
      {"device", "del"},
      {"reset-ipv6"},
      {"gateway", "del", "eth0", "--bogus", "1"},
  };
  for (auto const& args : usage) {
    RunResult r = Tool(args);
    EXPECT_EQ(1, r.status) << (args.empty() ? "" : args[0]);
    EXPECT_EQ(0u, r.err.find("vornnetdtool: ")) << r.err;
    EXPECT_EQ("", r.out);
  }
}

TEST(ToolWithoutDaemon, ExitsOneWithTheBusError) {
  RunResult r = Tool({"--refresh-gateway", "all"});
  EXPECT_EQ(1, r.status);
  EXPECT_EQ(0u, r.err.find("vornnetdtool: refresh gateway: ")) << r.err;
  EXPECT_NE(std::string::npos, r.err.find("com.vornlink.net")) << r.err;
}

TEST(ToolAgainstVornnetd, RefreshGatewayAll) {
  DaemonProcess daemon({VORNNETD}, "com.vornlink.net");
  ASSERT_TRUE(daemon.ready());
  RunResult r = Tool({"--refresh-gateway", "all"});
  // Without RouteModule in this build the daemon answers the method's failure text.
  if (r.status != 0) {
    EXPECT_EQ(1, r.status);
    EXPECT_EQ("vornnetdtool: refresh gateway: failed to refresh gateway\n", r.err);
  }
  EXPECT_TRUE(daemon.running());
  EXPECT_EQ(0, daemon.Stop(SIGTERM));
}

}  // namespace
