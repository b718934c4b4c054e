// DBusClient against vorn-test-dbus-service on the test's bus.
#include <gio/gio.h>
#include <gtest/gtest.h>
#include <syslog.h>

#include <chrono>
#include <string>
#include <thread>

#include "service_process.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "vornplatform/dbus.h"

namespace {

using vornnetsdk::dbus::DBUS_BUS_SESSION;
using vornnetsdk::dbus::DBusClient;
using vornnetsdk::dbus::DBusGObjectInfo;
using vornnetsdk::dbus::DBusMethodEntry;
using vornnetsdk::dbus::DBusServer;
using vorntest::ServiceProcess;

const char kService[] = "com.vornlink.test";
const std::string kUnmapped = "org.freedesktop.DBus.GLib.UnmappedError.";

std::string ClientLine(const std::string& message) {
  return vorntest::LogLine("dbus/dbus_client.cpp", message);
}

class Client : public testing::Test {
 protected:
  static void SetUpTestSuite() { service_ = new ServiceProcess(); }
  static void TearDownTestSuite() {
    int status = service_->Stop();
    if (status != 0) ADD_FAILURE() << "service ended with status " << status;
    delete service_;
    service_ = nullptr;
  }
  void SetUp() override {
    ASSERT_TRUE(service_->ready()) << "vorn-test-dbus-service did not start";
  }

  // One call with string arguments; the result of SendMessage.
  int Call(const char* method, std::initializer_list<const char*> args, int timeoutMs = -1) {
    if (client_.NewMessage(method) != 0) return -100;
    for (const char* a : args) {
      if (client_.Append(a) != 0) return -101;
    }
    return client_.SendMessage(true, timeoutMs);
  }

  static ServiceProcess* service_;
  DBusClient client_{kService, "/", "com.vornlink.test", DBUS_BUS_SESSION};
};
ServiceProcess* Client::service_ = nullptr;

TEST_F(Client, ReplyString) {
  ASSERT_EQ(0, Call("Echo", {"hi"}));
  std::string out;
  EXPECT_EQ(0, client_.GetReply(out));
  EXPECT_EQ("echo:hi", out);
  EXPECT_EQ("", client_.LastErrorName());
  EXPECT_EQ("", client_.LastErrorMessage());
}

TEST_F(Client, Utf8AndLargePayloadsRoundTrip) {
  ASSERT_EQ(0, Call("Echo", {"h\xc3\xa9llo \xe2\x9c\x93"}));
  std::string out;
  ASSERT_EQ(0, client_.GetReply(out));
  EXPECT_EQ("echo:h\xc3\xa9llo \xe2\x9c\x93", out);

  std::string big(300 * 1024, 'x');
  ASSERT_EQ(0, Call("Echo", {big.c_str()}));
  ASSERT_EQ(0, client_.GetReply(out));
  EXPECT_EQ("echo:" + big, out);
}

struct ErrorCase {
  const char* method;
  std::string name;
  std::string message;
  std::string domain;
  int code;
};

TEST_F(Client, RecognisesErrorNamesAndLogsTheMessage) {
  const ErrorCase cases[] = {
      {"FailBadParameter", kUnmapped + "Badparameter.Code1", "Bad parameter", "Badparameter", 1},
      {"FailNotFound", kUnmapped + "Error.Code4294967295", "USBModem [dev9] not found", "Error",
       -1},
      {"FailCode2", kUnmapped + "Error.Code2", "Failed to unlock PIN [dev9]", "Error", 2},
      {"FailWithoutError", "org.freedesktop.DBus.GLib.ErrorError",
       "Method invoked for FailWithoutError returned FALSE but did not set error", "", 0},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.method);
    vorntest::SyslogCapture log;
    EXPECT_EQ(-1, Call(c.method, {"dev9"}));
    EXPECT_EQ(c.name, client_.LastErrorName());
    EXPECT_EQ(c.message, client_.LastErrorMessage());
    EXPECT_EQ(c.domain, client_.LastErrorDomain());
    EXPECT_EQ(c.code, client_.LastErrorCode());
    std::string out = "untouched";
    EXPECT_EQ(-1, client_.GetReply(out));
    EXPECT_EQ("untouched", out);
    if (vorntest::SyslogCapture::Available()) {
      EXPECT_TRUE(log.HasOnce(LOG_ERR, ClientLine(std::string("Call ") + c.method +
                                                  " failed: " + c.message + " [" + c.name + "]")))
          << log.Dump();
    }
  }
  // A success clears the last error.
  ASSERT_EQ(0, Call("Echo", {"ok"}));
  EXPECT_EQ("", client_.LastErrorName());
  EXPECT_EQ(0, client_.LastErrorCode());
}

TEST_F(Client, PartialDataAndNullOut) {
  ASSERT_EQ(0, Call("PartialData", {"dev2"}));
  std::string out;
  ASSERT_EQ(0, client_.GetReply(out));
  EXPECT_EQ("{\"devid\" : \"dev2\"}", out);

  ASSERT_EQ(0, Call("NullOut", {}));
  out = "x";
  ASSERT_EQ(0, client_.GetReply(out));
  EXPECT_EQ("", out);
}

TEST_F(Client, BooleanArgument) {
  std::string out;
  for (bool protection : {true, false}) {
    ASSERT_EQ(0, client_.NewMessage("SetPIN"));
    ASSERT_EQ(0, client_.Append("dev1"));
    ASSERT_EQ(0, client_.Append("0000"));
    ASSERT_EQ(0, client_.Append("1111"));
    ASSERT_EQ(0, client_.Append(protection));
    ASSERT_EQ(0, client_.SendMessage(true, -1));
    ASSERT_EQ(0, client_.GetReply(out));
    EXPECT_EQ(std::string("dev1:0000:1111:") + (protection ? "on" : "off"), out);
  }
}

TEST_F(Client, GetReplyGivesTheFirstString) {
  ASSERT_EQ(0, Call("Split", {"one two three"}));
  std::string out;
  ASSERT_EQ(0, client_.GetReply(out));
  EXPECT_EQ("one", out);

  ASSERT_EQ(0, Call("Store", {"client-key", "v"}));
  EXPECT_EQ(-1, client_.GetReply(out));
}

TEST_F(Client, WithoutReplyTheCallRunsAndFailuresAreNotSeen) {
  ASSERT_EQ(0, client_.NewMessage("Store"));
  ASSERT_EQ(0, client_.Append("noreply-key"));
  ASSERT_EQ(0, client_.Append("stored without reply"));
  EXPECT_EQ(0, client_.SendMessage(false, -1));
  std::string out;
  EXPECT_EQ(-1, client_.GetReply(out));

  vorntest::SyslogCapture log;
  ASSERT_EQ(0, client_.NewMessage("FailBadParameter"));
  ASSERT_EQ(0, client_.Append("dev0"));
  EXPECT_EQ(0, client_.SendMessage(false, 1000));
  EXPECT_EQ("", client_.LastErrorName());

  // Calls on one connection arrive in order: the store has happened.
  ASSERT_EQ(0, Call("Fetch", {"noreply-key"}));
  ASSERT_EQ(0, client_.GetReply(out));
  EXPECT_EQ("stored without reply", out);
  if (vorntest::SyslogCapture::Available()) {
    EXPECT_TRUE(log.Matching("dbus_client").empty()) << log.Dump();
  }
}

TEST_F(Client, TimeoutOnASlowHandler) {
  vorntest::SyslogCapture log;
  // The handler answers "slept" after two seconds: a client that waited for it would see that
  // reply. Giving up with NoReply shows the 300 ms limit ended the call first (event order, no
  // upper bound on real time); the monotonic clock shows it did not give up before the limit.
  auto start = std::chrono::steady_clock::now();
  EXPECT_EQ(-1, Call("Sleep", {"2000"}, 300));
  auto elapsed = std::chrono::steady_clock::now() - start;
  EXPECT_GE(elapsed, std::chrono::milliseconds(250));
  EXPECT_EQ("org.freedesktop.DBus.Error.NoReply", client_.LastErrorName());
  EXPECT_FALSE(client_.LastErrorMessage().empty());
  std::string none;
  EXPECT_EQ(-1, client_.GetReply(none)) << none;
  if (vorntest::SyslogCapture::Available()) {
    EXPECT_EQ(1u, log.Matching("^dbus/dbus_client\\.cpp:[0-9]+ Call Sleep failed: "
                               ".*\\[org\\.freedesktop\\.DBus\\.Error\\.NoReply\\]$")
                      .size())
        << log.Dump();
  }
  // The service answers again once the handler is done; the default timeout is long enough.
  ASSERT_EQ(0, Call("Echo", {"later"}));
  std::string out;
  ASSERT_EQ(0, client_.GetReply(out));
  EXPECT_EQ("echo:later", out);
}

TEST_F(Client, IsServerReady) {
  EXPECT_TRUE(client_.IsServerReady());
  DBusClient absent("com.vornlink.absent", "/", "com.vornlink.absent", DBUS_BUS_SESSION);
  EXPECT_FALSE(absent.IsServerReady());
  DBusClient invalid("", "/", "com.vornlink.test", DBUS_BUS_SESSION);
  EXPECT_FALSE(invalid.IsServerReady());
}

TEST_F(Client, AbsentServiceFails) {
  DBusClient absent("com.vornlink.absent", "/", "com.vornlink.absent", DBUS_BUS_SESSION);
  ASSERT_EQ(0, absent.NewMessage("Anything"));
  EXPECT_EQ(-1, absent.SendMessage(true, -1));
  EXPECT_EQ("org.freedesktop.DBus.Error.ServiceUnknown", absent.LastErrorName());
}

TEST_F(Client, MisuseIsRefused) {
  DBusClient c(kService, "/", "com.vornlink.test", DBUS_BUS_SESSION);
  std::string out;
  EXPECT_EQ(-1, c.Append("x"));
  EXPECT_EQ(-1, c.Append(true));
  EXPECT_EQ(-1, c.SendMessage(true, -1));
  EXPECT_EQ(-1, c.GetReply(out));
  EXPECT_EQ(-1, c.NewMessage(nullptr));
  EXPECT_EQ(-1, c.NewMessage("not.a.member"));
  EXPECT_EQ(-1, c.Append("x"));

  ASSERT_EQ(0, c.NewMessage("Echo"));
  EXPECT_EQ(-1, c.Append(static_cast<const char*>(nullptr)));
  EXPECT_EQ(-1, c.Append("bad \xff utf-8"));
  EXPECT_EQ(0, c.Append("fine"));
  EXPECT_EQ(0, c.SendMessage(true, -1));
  EXPECT_EQ(-1, c.SendMessage(true, -1));  // the message went with the first send
  ASSERT_EQ(0, c.NewMessage("Echo"));
  ASSERT_EQ(0, c.Append("again"));
  ASSERT_EQ(0, c.SendMessage(true, -1));
  ASSERT_EQ(0, c.GetReply(out));
  EXPECT_EQ("echo:again", out);

  DBusClient badPath(kService, "relative", "com.vornlink.test", DBUS_BUS_SESSION);
  ASSERT_EQ(0, badPath.NewMessage("Echo"));
  EXPECT_EQ(-1, badPath.SendMessage(true, -1));
}

TEST_F(Client, WrongArgumentsGiveInvalidArgs) {
  EXPECT_EQ(-1, Call("Echo", {}));
  EXPECT_EQ("org.freedesktop.DBus.Error.InvalidArgs", client_.LastErrorName());
}

TEST_F(Client, SignalFromTheServer) {
  GError* error = nullptr;
  GMainContext* context = g_main_context_new();
  g_main_context_push_thread_default(context);
  GDBusConnection* bus = g_bus_get_sync(G_BUS_TYPE_SESSION, nullptr, &error);
  ASSERT_NE(nullptr, bus) << error->message;
  std::string received;
  guint sub = g_dbus_connection_signal_subscribe(
      bus, kService, "com.vornlink.test", "Changed", "/", nullptr, G_DBUS_SIGNAL_FLAGS_NONE,
      [](GDBusConnection*, const gchar*, const gchar*, const gchar*, const gchar*, GVariant* params,
         gpointer out) {
        const char* value = nullptr;
        g_variant_get(params, "(&s)", &value);
        *static_cast<std::string*>(out) = value;
      },
      &received, nullptr);
  // The match rule reaches the bus before the call below on the same shared connection.
  ASSERT_EQ(0, Call("Emit", {"state changed"}));
  auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(10);
  while (received.empty() && std::chrono::steady_clock::now() < deadline) {
    g_main_context_iteration(context, FALSE);
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
  }
  EXPECT_EQ("state changed", received);
  g_dbus_connection_signal_unsubscribe(bus, sub);
  g_object_unref(bus);
  g_main_context_pop_thread_default(context);
  while (g_main_context_iteration(context, FALSE)) {
  }
  g_main_context_unref(context);
}

// A handler of a service that calls another service with DBusClient, while its own loop waits.
const char kRelayXml[] = R"(<node>
  <interface name="com.vornlink.relay">
    <method name="Relay">
      <arg name="text" type="s" direction="in"/>
      <arg name="reply" type="s" direction="out"/>
    </method>
  </interface>
</node>)";

gboolean relay_relay(void*, const char* text, char** reply, GError** error) {
  DBusClient client(kService, "/", "com.vornlink.test", DBUS_BUS_SESSION);
  std::string out;
  if (client.NewMessage("Echo") < 0 || client.Append(text) < 0 ||
      client.SendMessage(true, 5000) < 0 || client.GetReply(out) < 0) {
    g_set_error(error, g_quark_from_static_string("error"), -1, "Relay failed");
    return FALSE;
  }
  *reply = g_strdup(("relayed " + out).c_str());
  return TRUE;
}

const DBusMethodEntry kRelayMethods[] = {VORN_DBUS_METHOD("Relay", relay_relay)};
const DBusGObjectInfo kRelayInfo = {"com.vornlink.relay", kRelayXml, kRelayMethods, 1};

TEST_F(Client, ClientInsideAHandlerDoesNotBlockTheLoop) {
  DBusServer relay("com.vornlink.test.relay", "/", DBUS_BUS_SESSION);
  ASSERT_TRUE(relay.Initialize(G_TYPE_INVALID, &kRelayInfo, nullptr));
  int rc = -99;
  std::string out;
  std::thread caller([&] {
    DBusClient c("com.vornlink.test.relay", "/", "com.vornlink.relay", DBUS_BUS_SESSION);
    if (c.NewMessage("Relay") == 0 && c.Append("ping") == 0) rc = c.SendMessage(true, 10000);
    if (rc == 0) c.GetReply(out);
    relay.QuitLoop();
  });
  EXPECT_TRUE(relay.StartLoop());
  caller.join();
  EXPECT_EQ(0, rc);
  EXPECT_EQ("relayed echo:ping", out);
}

}  // namespace
