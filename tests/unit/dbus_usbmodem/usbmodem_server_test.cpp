// The USB modem service: handlers called directly for their error paths and lists, the object
// type, the introspection XML, and the server on the sandbox's bus answering gdbus.
#include "vornwireless/dbus_usbmodem/usbmodem_server.h"

#include <gio/gio.h>
#include <gtest/gtest.h>

#include <string>
#include <thread>
#include <vector>

#include "support/syslog_capture.h"
#include "support/test_util.h"

using namespace vornwireless::dbus;
using vornwireless::usbmodem_lib::USBModem;
using vorntest::LogLine;
using vorntest::SyslogCapture;

namespace {

const char kFile[] = "dbus_usbmodem/usbmodem_server.cpp";

// A modem in a chosen state, put into the registry by assignment (which carries the link).
class StateModem : public USBModem {
 public:
  StateModem(unsigned id, bool inited, int net, std::string const& ifname) : USBModem(id, "") {
    _infoState = inited ? INFO_INITED : INFO_NOT_INITED;
    _netStatus = net;
    _ifName = ifname;
    _localIP = ifname.empty() ? "" : "10.0.0.1";
  }
};

struct ObjectHolder {
  ObjectHolder() : obj(static_cast<USBModemObject*>(g_object_new(usbmodem_object_get_type(), nullptr))) {}
  ~ObjectHolder() { g_object_unref(obj); }
  void Add(StateModem const& m) {
    obj->list.push_back(USBModem(m.GetIfid(), ""));
    obj->list.back() = m;
  }
  USBModemObject* obj;
};

struct Err {
  GError* e = nullptr;
  ~Err() { g_clear_error(&e); }
  std::string domain() const { return e ? g_quark_to_string(e->domain) : ""; }
  int code() const { return e ? e->code : 0; }
  std::string message() const { return e ? e->message : ""; }
};

void ExpectBadParameter(gboolean ok, Err const& err) {
  EXPECT_FALSE(ok);
  EXPECT_EQ(err.domain(), "badparameter");
  EXPECT_EQ(err.code(), 1);
  EXPECT_EQ(err.message(), "Bad parameter");
}

TEST(USBModemServerHandlers, NullObjectOrNullStringIsABadParameter) {
  ObjectHolder h;
  char* out = nullptr;
  SyslogCapture syslog;
  { Err e; ExpectBadParameter(usbmodem_connect(nullptr, "usbmodem3", &e.e), e); }
  { Err e; ExpectBadParameter(usbmodem_connect(h.obj, nullptr, &e.e), e); }
  { Err e; ExpectBadParameter(usbmodem_disconnect(h.obj, nullptr, &e.e), e); }
  { Err e; ExpectBadParameter(usbmodem_get_usbmodem_list(nullptr, &out, &e.e), e); }
  { Err e; ExpectBadParameter(usbmodem_get_usbmodem(h.obj, nullptr, &out, &e.e), e); }
  { Err e; ExpectBadParameter(usbmodem_get_sim_info(h.obj, nullptr, &out, &e.e), e); }
  { Err e; ExpectBadParameter(usbmodem_unlock_sim(h.obj, "usbmodem3", nullptr, &e.e), e); }
  { Err e; ExpectBadParameter(usbmodem_set_pin(h.obj, "usbmodem3", "1", nullptr, TRUE, &e.e), e); }
  { Err e; ExpectBadParameter(usbmodem_set_pin(h.obj, "usbmodem3", nullptr, "1", TRUE, &e.e), e); }
  { Err e; ExpectBadParameter(usbmodem_get_profile(nullptr, "usbmodem3", &out, &e.e), e); }
  { Err e; ExpectBadParameter(usbmodem_set_profile(h.obj, "usbmodem3", nullptr, &e.e), e); }
  { Err e; ExpectBadParameter(usbmodem_unlock_pin(h.obj, "usbmodem3", nullptr, "1", &e.e), e); }
  { Err e; ExpectBadParameter(usbmodem_unlock_pin(h.obj, "usbmodem3", "1", nullptr, &e.e), e); }
  { Err e; ExpectBadParameter(usbmodem_get_usbmodem_if_list(nullptr, &out, &e.e), e); }
  { Err e; ExpectBadParameter(usbmodem_get_devid_by_ifname(h.obj, nullptr, &out, &e.e), e); }
  EXPECT_EQ(out, nullptr);
  EXPECT_EQ(syslog.Matching(LogLine(kFile, "Bad parameter")).size(), 15u) << syslog.Dump();
  // A NULL GError** is accepted too.
  EXPECT_FALSE(usbmodem_connect(nullptr, nullptr, nullptr));
}

TEST(USBModemServerHandlers, UnknownAndUninitialisedModems) {
  ObjectHolder h;
  h.Add(StateModem(5, false, USBModem::NET_DISCONNECTED, ""));
  SyslogCapture syslog;
  char* out = nullptr;
  {
    Err e;
    EXPECT_FALSE(usbmodem_get_usbmodem(h.obj, "usbmodem9", &out, &e.e));
    EXPECT_EQ(e.domain(), "error");
    EXPECT_EQ(e.code(), -1);
    EXPECT_EQ(e.message(), "USBModem [usbmodem9] not found");
  }
  EXPECT_TRUE(syslog.HasOnce(LOG_ERR, LogLine(kFile, "USBModem [usbmodem9] not found")));
  {
    Err e;
    EXPECT_FALSE(usbmodem_unlock_sim(h.obj, "usbmodem5", "1234", &e.e));
    EXPECT_EQ(e.domain(), "error");
    EXPECT_EQ(e.code(), -1);
    EXPECT_EQ(e.message(), "USBModem [usbmodem5] not inited");
  }
  for (const char* id : {"", "usbmodem05", "USBMODEM5", "usbmodem5\n"}) {
    Err e;
    EXPECT_FALSE(usbmodem_set_profile(h.obj, id, "{}", &e.e));
    EXPECT_EQ(e.message(), std::string("USBModem [") + id + "] not found");
  }
  EXPECT_EQ(out, nullptr);
}

TEST(USBModemServerHandlers, ListsShowInitialisedModemsOnly) {
  ObjectHolder h;
  char* out = nullptr;
  Err e0;
  ASSERT_TRUE(usbmodem_get_usbmodem_list(h.obj, &out, &e0.e));
  EXPECT_STREQ(out, "");
  g_free(out);
  h.Add(StateModem(3, true, USBModem::NET_CONNECTED, "ppp0"));
  h.Add(StateModem(4, false, USBModem::NET_DISCONNECTED, ""));
  h.Add(StateModem(6, true, USBModem::NET_DISCONNECTED, "ppp1"));
  Err e1;
  ASSERT_TRUE(usbmodem_get_usbmodem_list(h.obj, &out, &e1.e));
  EXPECT_STREQ(out, "usbmodem3\nusbmodem6\n");
  g_free(out);
  Err e2;
  ASSERT_TRUE(usbmodem_get_usbmodem_if_list(h.obj, &out, &e2.e));
  EXPECT_STREQ(out, "ppp0\n\n");  // a modem that is not connected gives an empty line
  g_free(out);
  Err e3;
  ASSERT_TRUE(usbmodem_get_devid_by_ifname(h.obj, "ppp0", &out, &e3.e));
  EXPECT_STREQ(out, "usbmodem3");
  g_free(out);
  // The interface of a modem that is not connected is not known.
  Err e4;
  ASSERT_TRUE(usbmodem_get_devid_by_ifname(h.obj, "ppp1", &out, &e4.e));
  EXPECT_STREQ(out, "");
  g_free(out);
  Err e5;
  ASSERT_TRUE(usbmodem_get_devid_by_ifname(h.obj, "", &out, &e5.e));
  EXPECT_STREQ(out, "");
  g_free(out);
}

TEST(USBModemServerHandlers, DisconnectWithoutDiallerFails) {
  ObjectHolder h;
  h.Add(StateModem(7, true, USBModem::NET_DISCONNECTED, ""));
  Err e;
  EXPECT_FALSE(usbmodem_disconnect(h.obj, "usbmodem7", &e.e));
  EXPECT_EQ(e.domain(), "error");
  EXPECT_EQ(e.code(), -1);
  EXPECT_EQ(e.message(), "Failed to disconnect [usbmodem7]");
}

TEST(USBModemServerHandlers, PinCodesThatCouldSmuggleCommandsAreRefusedWithCodeOne) {
  ObjectHolder h;
  h.Add(StateModem(7, true, USBModem::NET_DISCONNECTED, ""));
  for (const char* pin : {"12\r34", "12\n", "\"", "1\x01", "\x7f"}) {
    Err e;
    EXPECT_FALSE(usbmodem_unlock_sim(h.obj, "usbmodem7", pin, &e.e));
    EXPECT_EQ(e.code(), 1);
    EXPECT_EQ(e.message(), "Failed to unlock PIN [usbmodem7]");
    Err p;
    EXPECT_FALSE(usbmodem_unlock_pin(h.obj, "usbmodem7", pin, "1234", &p.e));
    EXPECT_EQ(p.code(), 1);
    Err s;
    EXPECT_FALSE(usbmodem_set_pin(h.obj, "usbmodem7", "1234", pin, TRUE, &s.e));
    EXPECT_EQ(s.code(), 1);
    EXPECT_EQ(s.message(), "Failed to set PIN [usbmodem7]");
  }
}

TEST(USBModemServerHandlers, SetProfileRefusesUnusableJsonBeforeTouchingTheLink) {
  ObjectHolder h;
  h.Add(StateModem(7, true, USBModem::NET_DISCONNECTED, ""));
  for (const char* text : {R"({"apn": "a\"b"})", R"({"number": "*99#\r\nATH"})", R"([1, 2])",
                           R"({"apn": {"x": 1}})", R"({"user": "a\nb"})", "42",
                           R"({"a\nb": "x"})", R"({"": "x"})", R"({"k=v": "x"})"}) {
    Err e;
    EXPECT_FALSE(usbmodem_set_profile(h.obj, "usbmodem7", text, &e.e)) << text;
    EXPECT_EQ(e.domain(), "error");
    EXPECT_EQ(e.code(), -1);
    EXPECT_EQ(e.message(), "Failed to set profile") << text;
  }
  Err e;
  EXPECT_FALSE(usbmodem_set_profile(h.obj, "usbmodem7", "not json {", &e.e));
  EXPECT_EQ(e.message(), "Failed to read profile string");
}

TEST(USBModemServerHandlers, GetUSBModemHandsOutPartialDataWithItsError) {
  ObjectHolder h;
  h.Add(StateModem(7, true, USBModem::NET_DISCONNECTED, ""));
  char* out = nullptr;
  Err e;
  SyslogCapture syslog;
  // No modem answers here: the SIM reads as an error, and the data still comes.
  EXPECT_TRUE(usbmodem_get_usbmodem(h.obj, "usbmodem7", &out, &e.e));
  ASSERT_NE(out, nullptr);
  Json::Value v;
  Json::Reader r;
  ASSERT_TRUE(r.parse(out, v));
  EXPECT_EQ(v["id"].asString(), "usbmodem7");
  EXPECT_EQ(v["net_status"].asString(), "disconnected");
  EXPECT_EQ(e.message(), "USBModem error detected when get usbmodem data");
  EXPECT_TRUE(syslog.HasOnce(LOG_WARNING,
                             LogLine(kFile, "USBModem error detected when get usbmodem data")));
  g_free(out);
  out = nullptr;
  Err s;
  EXPECT_FALSE(usbmodem_get_sim_info(h.obj, "usbmodem7", &out, &s.e));
  EXPECT_EQ(out, nullptr);
  EXPECT_EQ(s.message(), "USBModem error detected when get usbmodem sim info");
}

TEST(USBModemServerHandlers, PollingTickAlwaysRepeats) {
  ObjectHolder h;
  EXPECT_TRUE(usbmodem_polling_tick(h.obj));
  EXPECT_TRUE(usbmodem_polling_tick(nullptr));
}

TEST(USBModemServerObject, TypeIsRegisteredOnceUnderItsName) {
  GType t = usbmodem_object_get_type();
  EXPECT_STREQ(g_type_name(t), "USBModemObject");
  EXPECT_EQ(g_type_parent(t), G_TYPE_OBJECT);
  EXPECT_EQ(usbmodem_object_get_type(), t);
  EXPECT_EQ(g_type_from_name("USBModemObject"), t);
}

TEST(USBModemServerObject, IntrospectionHasTheTwelveMethodsInTableOrder) {
  GError* err = nullptr;
  GDBusNodeInfo* node = g_dbus_node_info_new_for_xml(kUsbmodemIntrospectionXml, &err);
  ASSERT_NE(node, nullptr) << (err ? err->message : "");
  GDBusInterfaceInfo* iface = g_dbus_node_info_lookup_interface(node, "com.vornlink.usbmodem");
  ASSERT_NE(iface, nullptr);
  struct M {
    const char* name;
    std::vector<std::string> in;
    std::vector<std::string> out;
  };
  std::vector<M> expected = {
      {"Connect", {"devid"}, {}},
      {"Disconnect", {"devid"}, {}},
      {"GetUSBModemList", {}, {"usbmodem_list"}},
      {"GetUSBModem", {"devid"}, {"usbmodem"}},
      {"GetSimInfo", {"devid"}, {"usbmodem"}},
      {"UnlockSIM", {"devid", "pin"}, {}},
      {"SetPIN", {"devid", "oldpin", "newpin", "protection"}, {}},
      {"GetProfile", {"devid"}, {"profile"}},
      {"SetProfile", {"devid", "profile"}, {}},
      {"UnlockPIN", {"devid", "puk", "pin"}, {}},
      {"GetUSBModemIfList", {}, {"usbmodem_if_list"}},
      {"GetDevIdByIfName", {"ifname"}, {"devid"}},
  };
  size_t n = 0;
  while (iface->methods[n]) ++n;
  ASSERT_EQ(n, expected.size());
  for (size_t i = 0; i < n; ++i) {
    GDBusMethodInfo* m = iface->methods[i];
    EXPECT_EQ(m->name, std::string(expected[i].name));
    std::vector<std::string> in, out;
    for (size_t a = 0; m->in_args && m->in_args[a]; ++a) {
      in.push_back(m->in_args[a]->name);
      std::string sig = m->in_args[a]->signature;
      EXPECT_EQ(sig, in.back() == "protection" ? "b" : "s");
    }
    for (size_t a = 0; m->out_args && m->out_args[a]; ++a) out.push_back(m->out_args[a]->name);
    EXPECT_EQ(in, expected[i].in) << m->name;
    EXPECT_EQ(out, expected[i].out) << m->name;
  }
  g_dbus_node_info_unref(node);
  const auto* info = usbmodem_object_info();
  ASSERT_EQ(info->nMethods, 12u);
  EXPECT_STREQ(info->interfaceName, "com.vornlink.usbmodem");
  for (size_t i = 0; i < 12; ++i) EXPECT_STREQ(info->methods[i].name, expected[i].name);
}

TEST(USBModemServerOnTheBus, AnswersGdbusWithTheUnmappedErrorNames) {
  USBModemServer server;
  ASSERT_TRUE(server.Initialize());
  EXPECT_TRUE(server.IsInitialized());
  EXPECT_NE(server.GetList(), nullptr);
  EXPECT_TRUE(server.GetList()->empty());
  std::thread client([&server] {
    auto list = vorntest::Run({"/usr/bin/gdbus", "call", "--session", "--dest",
                               "com.vornlink.usbmodem", "--object-path", "/", "--method",
                               "com.vornlink.usbmodem.GetUSBModemList"});
    EXPECT_EQ(list.status, 0);
    EXPECT_EQ(list.out, "('',)\n");
    auto missing = vorntest::Run({"/usr/bin/gdbus", "call", "--session", "--dest",
                                  "com.vornlink.usbmodem", "--object-path", "/", "--method",
                                  "com.vornlink.usbmodem.GetProfile", "usbmodem9"});
    EXPECT_NE(missing.status, 0);
    EXPECT_NE(missing.err.find("GDBus.Error:org.freedesktop.DBus.GLib.UnmappedError.Error."
                               "Code4294967295: USBModem [usbmodem9] not found"),
              std::string::npos)
        << missing.err;
    auto intro = vorntest::Run({"/usr/bin/gdbus", "introspect", "--session", "--dest",
                                "com.vornlink.usbmodem", "--object-path", "/"});
    EXPECT_NE(intro.out.find("SetPIN(in  s devid,"), std::string::npos) << intro.out;
    server.QuitLoop();
  });
  EXPECT_TRUE(server.StartLoop());
  client.join();
  // A second server cannot take the name.
  USBModemServer second;
  EXPECT_FALSE(second.Initialize());
}

}  // namespace
