// The net service's handlers called directly: parameter checks, parsing, the request each method
// hands to its module, the reply text, and the failure texts of absent, refusing and throwing
// modules.
#include "vornwireless/dbus_net/net_server.h"

#include <gtest/gtest.h>
#include <syslog.h>

#include <functional>
#include <string>
#include <vector>

#include "fake_modules.h"
#include "support/syslog_capture.h"

#pragma GCC diagnostic ignored "-Wdeprecated-declarations"

namespace {

using namespace vornnetwork::dbus;
using vornnetwork::network::module::MODULE_DEVICELIST;
using vornnetwork::network::module::MODULE_IPV6;
using vornnetwork::network::module::MODULE_ROUTE;
using vorntest::LogLine;
using vorntest::Recorder;
using vorntest::SyslogCapture;

std::string ServerLine(const std::string& message) {
  return LogLine("dbus_net/net_server.cpp", message);
}

// One handler, called with a text; out: the reply (empty for methods without one).
struct Outcome {
  gboolean ok = FALSE;
  bool hasError = false;
  std::string domain;
  int code = 0;
  std::string message;
  std::string reply;
};

using Caller = std::function<gboolean(NetObject*, const char*, char**, GError**)>;

struct Method {
  const char* name;
  Caller call;
  bool json;  // the in string is JSON
  bool hasReply;
  int module;
  const char* failure;  // the error text when the module is absent or refuses
};

const std::vector<Method>& Methods() {
  static const std::vector<Method> methods = {
      {"GetDeviceListData",
       [](NetObject* o, const char* s, char** r, GError** e) {
         return net_get_device_list_data(o, s, r, e);
       },
       false, true, 4, "failed to get upnp data"},
      {"SetDeviceListData",
       [](NetObject* o, const char* s, char**, GError** e) {
         return net_set_device_list_data(o, s, e);
       },
       true, false, 4, "failed to set device type"},
      {"DelDeviceListData",
       [](NetObject* o, const char* s, char**, GError** e) {
         return net_del_device_list_data(o, s, e);
       },
       false, false, 4, "failed to set delete data"},
      {"GetGatewayListData",
       [](NetObject* o, const char* s, char** r, GError** e) {
         return net_get_gateway_list_data(o, s, r, e);
       },
       true, true, 3, "failed to get gateway list data"},
      {"AddGatewayData",
       [](NetObject* o, const char* s, char**, GError** e) {
         return net_add_gateway_data(o, s, e);
       },
       true, false, 3, "failed to add gateway data"},
      {"DelGatewayData",
       [](NetObject* o, const char* s, char**, GError** e) {
         return net_del_gateway_data(o, s, e);
       },
       true, false, 3, "failed to del gateway data"},
      {"GetGatewayDataByInterface",
       [](NetObject* o, const char* s, char** r, GError** e) {
         return net_get_gateway_data_by_interface(o, s, r, e);
       },
       true, true, 3, "failed to get gateway list data"},
      {"SetSlaveData",
       [](NetObject* o, const char* s, char**, GError** e) { return net_set_slave_data(o, s, e); },
       true, false, 3, "failed to set slave data"},
      {"CopyGatewayData",
       [](NetObject* o, const char* s, char**, GError** e) {
         return net_copy_gateway_data(o, s, e);
       },
       true, false, 3, "failed to copy gateway data"},
      {"RefreshGateway",
       [](NetObject* o, const char* s, char**, GError** e) { return net_refresh_gateway(o, s, e); },
       true, false, 3, "failed to refresh gateway"},
      {"ResetIPv6Module",
       [](NetObject* o, const char* s, char**, GError** e) {
         return net_reset_ipv6_module(o, s, e);
       },
       false, false, 2, "failed to reset ipv6 module"},
  };
  return methods;
}

Outcome Invoke(Method const& m, NetObject* object, const char* text) {
  Outcome out;
  char* reply = nullptr;
  GError* error = nullptr;
  out.ok = m.call(object, text, &reply, &error);
  if (error) {
    out.hasError = true;
    out.domain = g_quark_to_string(error->domain);
    out.code = error->code;
    out.message = error->message;
    g_error_free(error);
  }
  if (reply) out.reply = reply;
  g_free(reply);
  return out;
}

Json::Value ParseJson(std::string const& text) {
  Json::Reader reader;
  Json::Value v;
  EXPECT_TRUE(reader.parse(text, v)) << text;
  return v;
}

class NetHandlers : public testing::Test {
 protected:
  void SetUp() override {
    object_ = static_cast<NetObject*>(g_object_new(NetObjectGetType(), nullptr));
  }
  void TearDown() override {
    vorntest::RemoveRecordingModules();
    g_object_unref(object_);
  }
  NetObject* object_ = nullptr;
};

TEST_F(NetHandlers, ObjectInfoListsTheElevenMethodsInTableOrder) {
  const auto* info = NetObjectInfo();
  ASSERT_EQ(11u, info->nMethods);
  EXPECT_STREQ("com.vornlink.net", info->interfaceName);
  for (unsigned i = 0; i < info->nMethods; ++i) {
    EXPECT_STREQ(Methods()[i].name, info->methods[i].name);
    EXPECT_STREQ("s", info->methods[i].inSignature);
    EXPECT_STREQ(Methods()[i].hasReply ? "s" : "", info->methods[i].outSignature);
  }
}

TEST_F(NetHandlers, NullObjectOrStringIsABadParameter) {
  ASSERT_TRUE(vorntest::AddRecordingModules());
  for (auto const& m : Methods()) {
    for (int which = 0; which < 2; ++which) {
      SyslogCapture log;
      Outcome o = which == 0 ? Invoke(m, nullptr, "{}") : Invoke(m, object_, nullptr);
      EXPECT_FALSE(o.ok) << m.name;
      EXPECT_TRUE(o.hasError) << m.name;
      EXPECT_EQ("badparameter", o.domain) << m.name;
      EXPECT_EQ(1, o.code) << m.name;
      EXPECT_EQ("Bad parameter", o.message) << m.name;
      EXPECT_TRUE(log.HasOnce(LOG_ERR, ServerLine("Bad parameter"))) << log.Dump();
    }
  }
  for (auto type : {MODULE_IPV6, MODULE_ROUTE, MODULE_DEVICELIST}) {
    EXPECT_EQ(0, Recorder(type)->calls);
  }
}

TEST_F(NetHandlers, TextThatIsNotJsonFailsWithoutAnError) {
  ASSERT_TRUE(vorntest::AddRecordingModules());
  for (auto const& m : Methods()) {
    if (!m.json) continue;
    for (const char* text : {"not json", "{\"type\": ", "", "{\"a\" 1}"}) {
      SyslogCapture log;
      Outcome o = Invoke(m, object_, text);
      EXPECT_FALSE(o.ok) << m.name << " " << text;
      EXPECT_FALSE(o.hasError) << m.name << " " << text;
      std::string what = std::string(m.name) == "SetDeviceListData" ? "Failed to parse device data"
                                                                    : "Failed to parse info";
      EXPECT_TRUE(log.HasOnce(LOG_ERR, ServerLine(what))) << log.Dump();
    }
  }
  for (auto type : {MODULE_IPV6, MODULE_ROUTE, MODULE_DEVICELIST}) {
    EXPECT_EQ(0, Recorder(type)->calls);
  }
}

TEST_F(NetHandlers, AbsentModuleGivesTheMethodsFailureText) {
  for (auto const& m : Methods()) {
    SyslogCapture log;
    Outcome o = Invoke(m, object_, m.json ? "{\"type\": \"GTYPE_V4\"}" : "eth0");
    EXPECT_FALSE(o.ok) << m.name;
    ASSERT_TRUE(o.hasError) << m.name;
    EXPECT_EQ("error", o.domain);
    EXPECT_EQ(1, o.code);
    EXPECT_EQ(m.failure, o.message);
    EXPECT_TRUE(
        log.HasOnce(LOG_ERR, LogLine("network/module_manager.cpp",
                                     "Failed to find module [" + std::to_string(m.module) + "]")))
        << log.Dump();
    std::string logged =
        std::string(m.name) == "DelDeviceListData" ? "failed to delete data" : m.failure;
    EXPECT_TRUE(log.HasOnce(LOG_ERR, ServerLine(logged))) << log.Dump();
  }
}

TEST_F(NetHandlers, EachMethodHandsItsModuleTheRequestWithItsMethodMember) {
  ASSERT_TRUE(vorntest::AddRecordingModules());
  struct Case {
    size_t index;
    const char* text;
    const char* expected;  // the request the module receives
  };
  const Case cases[] = {
      {0, "upnp", R"({"method": "get", "scannertype": "upnp"})"},
      {1, R"({"macAddr": "00:11:22:33:44:55", "userdef_displayName": "tv"})",
       R"({"method": "set", "macAddr": "00:11:22:33:44:55", "userdef_displayName": "tv"})"},
      {2, "00:11:22:33:44:55", R"({"method": "del", "macAddr": "00:11:22:33:44:55"})"},
      {3, R"({"type": "GTYPE_V4"})", R"({"method": "GET_GATEWAY_LIST_DATA", "type": "GTYPE_V4"})"},
      {4, R"({"type": "GTYPE_V4", "ifname": "eth0", "priority": 0, "gateway": "10.0.0.1"})",
       R"({"method": "ADD_GATEWAY_DATA", "type": "GTYPE_V4", "ifname": "eth0", "priority": 0,
           "gateway": "10.0.0.1"})"},
      {5, R"({"type": "GTYPE_V6", "ifname": "eth1"})",
       R"({"method": "DEL_GATEWAY_DATA", "type": "GTYPE_V6", "ifname": "eth1"})"},
      {6, R"({"type": "GTYPE_V4", "ifname": "eth0"})",
       R"({"method": "GET_GATEWAY_DATA_BY_INTERFACE", "type": "GTYPE_V4", "ifname": "eth0"})"},
      {7, R"({"type": "GTYPE_V4", "ifname": "eth0", "slave": true})",
       R"({"method": "SET_SLAVE_DATA", "type": "GTYPE_V4", "ifname": "eth0", "slave": true})"},
      {8, R"({"type": "GTYPE_V4", "interface_source": "a", "interface_destination": "b"})",
       R"({"method": "COPY_GATEWAY_DATA", "type": "GTYPE_V4", "interface_source": "a",
           "interface_destination": "b"})"},
      {9, R"({"type": "ALL", "method": "overwritten"})",
       R"({"method": "REFRESH_GATEWAY", "type": "ALL"})"},
      {10, "eth0", R"({"method": "RESET_IPV6_MODULE", "ifname": "eth0"})"},
  };
  for (auto const& c : cases) {
    Method const& m = Methods()[c.index];
    Outcome o = Invoke(m, object_, c.text);
    ASSERT_TRUE(o.ok) << m.name << ": " << o.message;
    EXPECT_FALSE(o.hasError);
    auto* module = Recorder(static_cast<vornnetwork::network::module::MODULE_TYPE>(m.module));
    EXPECT_EQ(ParseJson(c.expected), module->last) << m.name;
    if (m.hasReply) {
      // The reply is the module's response in jsoncpp's styled form.
      Json::Value response = ParseJson(o.reply);
      EXPECT_EQ(response.toStyledString(), o.reply);
      EXPECT_EQ(ParseJson(c.expected), response["request"]);
      EXPECT_EQ(m.module, response["module"].asInt());
    } else {
      EXPECT_EQ("", o.reply);
    }
  }
}

TEST_F(NetHandlers, CommentsAreAllowedInRequests) {
  ASSERT_TRUE(vorntest::AddRecordingModules());
  Outcome o =
      Invoke(Methods()[3], object_, "{ // the v4 list\n \"type\": /* family */ \"GTYPE_V4\" }");
  ASSERT_TRUE(o.ok) << o.message;
  EXPECT_EQ("GTYPE_V4", Recorder(MODULE_ROUTE)->last["type"].asString());
}

TEST_F(NetHandlers, ModuleRefusalGivesTheFailureText) {
  ASSERT_TRUE(vorntest::AddRecordingModules());
  // The device list knows no "arp" scanner: the module refuses it.
  SyslogCapture log;
  Outcome o = Invoke(Methods()[0], object_, "arp");
  EXPECT_FALSE(o.ok);
  EXPECT_EQ("failed to get upnp data", o.message);
  EXPECT_EQ("", o.reply);
  EXPECT_EQ(1, Recorder(MODULE_DEVICELIST)->calls);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, ServerLine("failed to get upnp data"))) << log.Dump();

  for (auto const& m : Methods()) {
    if (!m.json) continue;
    Outcome r = Invoke(m, object_, "{\"fail\": true}");
    EXPECT_FALSE(r.ok) << m.name;
    EXPECT_EQ(m.failure, r.message) << m.name;
  }
  Outcome d = Invoke(Methods()[2], object_, "");
  EXPECT_TRUE(d.ok);  // an empty MAC is the module's to judge; the recorder takes it
}

TEST_F(NetHandlers, WrongMemberTypesAreCaughtAtTheEdge) {
  ASSERT_TRUE(vorntest::AddRecordingModules());
  auto* route = Recorder(MODULE_ROUTE);
  ASSERT_TRUE(
      Invoke(Methods()[4], object_, R"({"type": "GTYPE_V4", "ifname": "eth0", "priority": 1})").ok);
  Json::Value before = route->last;

  struct Case {
    size_t index;
    const char* text;
    const char* why;  // part of the logged reason
  };
  const Case cases[] = {
      {4, R"({"type": "GTYPE_V4", "ifname": "eth0", "priority": "x"})", "not convertible to Int"},
      {4, R"({"type": {"v": 4}, "ifname": "eth0"})", "not convertible to string"},
      {7, R"({"type": "GTYPE_V4", "ifname": "eth0", "slave": "yes"})", "not convertible to bool"},
      {4, R"([{"type": "GTYPE_V4"}])", "a JSON object is expected"},
      {3, R"(["GTYPE_V4"])", "a JSON object is expected"},
      {9, R"("ALL")", "a JSON object is expected"},
      {6, "5", "a JSON object is expected"},
      {1, R"([1, 2])", "a JSON object is expected"},
  };
  for (auto const& c : cases) {
    Method const& m = Methods()[c.index];
    SyslogCapture log;
    Outcome o = Invoke(m, object_, c.text);
    EXPECT_FALSE(o.ok) << c.text;
    EXPECT_EQ(m.failure, o.message) << c.text;
    EXPECT_EQ("", o.reply);
    EXPECT_EQ(1u, log.Matching(std::string("Bad request for ") + m.name + ": .*" + c.why).size())
        << c.text << "\n"
        << log.Dump();
    EXPECT_TRUE(log.HasOnce(LOG_ERR, ServerLine(m.failure))) << log.Dump();
  }
  EXPECT_EQ(before, route->last);  // nothing reached the records

  // "type": 5 is read as the text "5" by a module: no exception, the module decides.
  Outcome five = Invoke(Methods()[4], object_, R"({"type": 5, "ifname": "eth0"})");
  EXPECT_TRUE(five.ok);
  EXPECT_EQ(5, route->last["type"].asInt());
}

TEST_F(NetHandlers, NullJsonIsAnEmptyRequest) {
  ASSERT_TRUE(vorntest::AddRecordingModules());
  Outcome o = Invoke(Methods()[3], object_, "null");
  ASSERT_TRUE(o.ok) << o.message;
  EXPECT_EQ(ParseJson(R"({"method": "GET_GATEWAY_LIST_DATA"})"), Recorder(MODULE_ROUTE)->last);
}

}  // namespace
