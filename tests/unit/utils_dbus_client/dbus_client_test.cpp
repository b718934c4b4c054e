// GetGatewayPriority, SetGatewayInfo, DelGatewayInfo and RefreshGateway: the request each sends,
// what it makes of the answer, and its log line when the network daemon fails or is absent.
#include "vornwireless/utils/dbus_client.h"

#include <gtest/gtest.h>
#include <syslog.h>

#include <string>

#include "support/daemon_process.h"
#include "support/syslog_capture.h"
#include "vornwireless/dbus_net/net_client.h"

#pragma GCC diagnostic ignored "-Wdeprecated-declarations"

namespace {

using vorntest::DaemonProcess;
using vorntest::LogLine;
using vorntest::SyslogCapture;
using namespace vornwireless::utils;

std::string WrapperLine(const std::string& message) {
  return LogLine("utils/dbus_client.cpp", message);
}

Json::Value ParseJson(std::string const& text) {
  Json::Reader reader;
  Json::Value v;
  EXPECT_TRUE(reader.parse(text, v)) << text;
  return v;
}

// The request the route module got before this query.
Json::Value LastRouteRequest() {
  vornnetwork::dbus::NetClient client;
  Json::Value request(Json::objectValue), result;
  request["type"] = "probe";
  EXPECT_EQ(0, client.GetGatewayListData(request, result));
  return result["last"];
}

TEST(DBusClientWrappers, SetGetDelAndRefreshThroughTheDaemon) {
  DaemonProcess service({VORN_TEST_NET_SERVICE}, "com.vornlink.net");
  ASSERT_TRUE(service.ready());

  EXPECT_TRUE(SetGatewayInfo("eth0", "GTYPE_V4", "10.0.0.1", "8.8.8.8", "ethernet", 2, true));
  EXPECT_EQ(ParseJson(R"({"method": "ADD_GATEWAY_DATA", "type": "GTYPE_V4", "priority": 2,
                          "ifname": "eth0", "gateway": "10.0.0.1", "dns": "8.8.8.8",
                          "class": "ethernet"})"),
            LastRouteRequest());
  // The last argument has no effect: the same request either way.
  EXPECT_TRUE(SetGatewayInfo("eth0", "GTYPE_V4", "10.0.0.1", "8.8.8.8", "ethernet", 2, false));
  EXPECT_EQ("ADD_GATEWAY_DATA", LastRouteRequest()["method"].asString());

  EXPECT_EQ(2, GetGatewayPriority("eth0", "GTYPE_V4"));
  EXPECT_EQ(ParseJson(R"({"method": "GET_GATEWAY_DATA_BY_INTERFACE", "type": "GTYPE_V4",
                          "ifname": "eth0"})"),
            LastRouteRequest());
  EXPECT_EQ(-1, GetGatewayPriority("eth0", "GTYPE_V6"));  // listed for v4 only

  EXPECT_TRUE(SetGatewayInfo("6in4-eth0", "GTYPE_V6", "::", "NULL", "ethernet", 0, true));
  EXPECT_EQ(0, GetGatewayPriority("6in4-eth0", "GTYPE_V6"));

  EXPECT_TRUE(DelGatewayInfo("eth0", "GTYPE_V4", true));
  EXPECT_EQ(ParseJson(R"({"method": "DEL_GATEWAY_DATA", "type": "GTYPE_V4", "ifname": "eth0"})"),
            LastRouteRequest());
  EXPECT_EQ(-1, GetGatewayPriority("eth0", "GTYPE_V4"));
  EXPECT_TRUE(DelGatewayInfo("eth0", "GTYPE_V4", false));

  EXPECT_TRUE(RefreshGateway("ALL"));
  EXPECT_EQ(ParseJson(R"({"method": "REFRESH_GATEWAY", "type": "ALL"})"), LastRouteRequest());
}

TEST(DBusClientWrappers, WrongPriorityTypeInTheAnswerIsAFailure) {
  DaemonProcess service({VORN_TEST_NET_SERVICE}, "com.vornlink.net");
  ASSERT_TRUE(service.ready());
  // A request the recording module stores as is: the answer's "priority" is then a string.
  vornnetwork::dbus::NetClient client;
  Json::Value add(Json::objectValue);
  add["type"] = "GTYPE_V4";
  add["ifname"] = "odd0";
  add["priority"] = 3.5;  // a double: the module reads it as 3, stores the value as given
  ASSERT_EQ(0, client.AddGatewayData(add));
  SyslogCapture log;
  EXPECT_EQ(-1, GetGatewayPriority("odd0", "GTYPE_V4"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, WrapperLine("Failed to GetGatewayDataByInterface [odd0]")))
      << log.Dump();
}

TEST(DBusClientWrappers, NoDaemonGivesFailureAndOneLogLineEach) {
  SyslogCapture log;
  EXPECT_EQ(-1, GetGatewayPriority("eth0", "GTYPE_V4"));
  EXPECT_FALSE(SetGatewayInfo("eth0", "GTYPE_V4", "10.0.0.1", "NULL", "ethernet", 1, true));
  EXPECT_FALSE(DelGatewayInfo("wlan0", "GTYPE_V6", true));
  EXPECT_FALSE(RefreshGateway("GTYPE_V6"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, WrapperLine("Failed to GetGatewayDataByInterface [eth0]")))
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, WrapperLine("Failed to AddGatewayData on [eth0]")));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, WrapperLine("Failed to DelGatewayData on [wlan0]")));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, WrapperLine("Failed to refresh gateway of type [GTYPE_V6]")));
}

}  // namespace
