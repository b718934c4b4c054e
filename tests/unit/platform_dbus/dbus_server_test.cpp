// DBusServer on the wire: vorn-test-dbus-service answered by gdbus and dbus-send, and servers run
// inside the test for Initialize's checks and the loop.
#include <fcntl.h>
#include <gio/gio.h>
#include <glib-unix.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <spawn.h>
#include <sys/wait.h>
#include <syslog.h>
#include <unistd.h>

#include <chrono>
#include <cstdlib>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "service_process.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "vornplatform/dbus.h"

extern const char kTestIntrospectionXml[];

namespace {

using vornnetsdk::dbus::DBUS_BUS_SESSION;
using vornnetsdk::dbus::DBusGObjectInfo;
using vornnetsdk::dbus::DBusMethodEntry;
using vornnetsdk::dbus::DBusServer;
using vorntest::RunResult;
using vorntest::ServiceProcess;

const char kService[] = "com.vornlink.test";
const char kGdbus[] = "/usr/bin/gdbus";
const char kDBusSend[] = "/usr/bin/dbus-send";
const char kUnmapped[] = "org.freedesktop.DBus.GLib.UnmappedError.";

RunResult Gdbus(const std::string& method, const std::vector<std::string>& args = {},
                const std::string& dest = kService) {
  std::vector<std::string> argv = {kGdbus,   "call",     "--session",
                                   "--dest", dest,       "--object-path",
                                   "/",      "--method", "com.vornlink.test." + method};
  argv.insert(argv.end(), args.begin(), args.end());
  return vorntest::Run(argv);
}

RunResult DBusSend(const std::string& method, const std::vector<std::string>& args = {}) {
  std::vector<std::string> argv = {kDBusSend,
                                   "--session",
                                   "--print-reply",
                                   std::string("--dest=") + kService,
                                   "/",
                                   "com.vornlink.test." + method};
  argv.insert(argv.end(), args.begin(), args.end());
  return vorntest::Run(argv);
}

// The lines of dbus-send's reply after its "method return ..." header.
std::string DBusSendBody(const RunResult& r) {
  if (r.out.compare(0, 14, "method return ") != 0) return "<no method return: " + r.out + ">";
  std::size_t nl = r.out.find('\n');
  return nl == std::string::npos ? "" : r.out.substr(nl + 1);
}

std::string GdbusError(const std::string& name, const std::string& message) {
  return "Error: GDBus.Error:" + name + ": " + message + "\n";
}

std::string DBusSendError(const std::string& name, const std::string& message) {
  return "Error " + name + ": " + message + "\n";
}

// One service for the whole suite: these tests only read from it (Store/Fetch use own keys).
class ServiceWire : public testing::Test {
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

  static ServiceProcess* service_;
};
ServiceProcess* ServiceWire::service_ = nullptr;

TEST_F(ServiceWire, TrueSendsTheOutString) {
  RunResult r = Gdbus("Echo", {"hello"});
  EXPECT_EQ(0, r.status) << r.err;
  EXPECT_EQ("('echo:hello',)\n", r.out);

  r = DBusSend("Echo", {"string:hello"});
  EXPECT_EQ(0, r.status) << r.err;
  EXPECT_EQ("   string \"echo:hello\"\n", DBusSendBody(r));
}

struct FailureCase {
  const char* method;
  std::string name;
  std::string message;
};

TEST_F(ServiceWire, FalseWithErrorGivesUnmappedErrorName) {
  const std::vector<FailureCase> cases = {
      {"FailBadParameter", std::string(kUnmapped) + "Badparameter.Code1", "Bad parameter"},
      {"FailNotFound", std::string(kUnmapped) + "Error.Code4294967295",
       "USBModem [dev0] not found"},
      {"FailCode2", std::string(kUnmapped) + "Error.Code2", "Failed to unlock PIN [dev0]"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.method);
    RunResult r = Gdbus(c.method, {"dev0"});
    EXPECT_EQ(1, r.status);
    EXPECT_EQ("", r.out);
    EXPECT_EQ(GdbusError(c.name, c.message), r.err);

    r = DBusSend(c.method, {"string:dev0"});
    EXPECT_EQ(1, r.status);
    EXPECT_EQ(DBusSendError(c.name, c.message), r.err);
  }
}

TEST_F(ServiceWire, DomainWithSeparatorsIsCamelCased) {
  RunResult r = Gdbus("Fetch", {"no-such-key"});
  EXPECT_EQ(1, r.status);
  EXPECT_EQ(
      GdbusError(std::string(kUnmapped) + "SomeDomainName.Code7", "No value for [no-such-key]"),
      r.err);
}

TEST_F(ServiceWire, FalseWithoutErrorGivesErrorError) {
  RunResult r = Gdbus("FailWithoutError", {"dev0"});
  EXPECT_EQ(1, r.status);
  EXPECT_EQ(GdbusError("org.freedesktop.DBus.GLib.ErrorError",
                       "Method invoked for FailWithoutError returned FALSE but did not set error"),
            r.err);

  r = DBusSend("FailWithoutError", {"string:dev0"});
  EXPECT_EQ(1, r.status);
  EXPECT_EQ(
      DBusSendError("org.freedesktop.DBus.GLib.ErrorError",
                    "Method invoked for FailWithoutError returned FALSE but did not set error"),
      r.err);
}

TEST_F(ServiceWire, TrueWithErrorSetStillSendsTheOutString) {
  RunResult r = Gdbus("PartialData", {"dev3"});
  EXPECT_EQ(0, r.status) << r.err;
  EXPECT_EQ("('{\"devid\" : \"dev3\"}',)\n", r.out);
  EXPECT_EQ("", r.err);
}

TEST_F(ServiceWire, NullOutStringIsSentEmpty) {
  RunResult r = Gdbus("NullOut");
  EXPECT_EQ(0, r.status) << r.err;
  EXPECT_EQ("('',)\n", r.out);

  r = DBusSend("NullOut");
  EXPECT_EQ(0, r.status) << r.err;
  EXPECT_EQ("   string \"\"\n", DBusSendBody(r));
}

TEST_F(ServiceWire, BooleanInArgument) {
  RunResult r = Gdbus("SetPIN", {"dev1", "1234", "5678", "true"});
  EXPECT_EQ(0, r.status) << r.err;
  EXPECT_EQ("('dev1:1234:5678:on',)\n", r.out);

  r = DBusSend("SetPIN", {"string:dev1", "string:1234", "string:5678", "boolean:false"});
  EXPECT_EQ(0, r.status) << r.err;
  EXPECT_EQ("   string \"dev1:1234:5678:off\"\n", DBusSendBody(r));
}

TEST_F(ServiceWire, TwoInStringsNoOut) {
  RunResult r = Gdbus("Store", {"wire-key", "wire value"});
  EXPECT_EQ(0, r.status) << r.err;
  EXPECT_EQ("()\n", r.out);

  r = DBusSend("Store", {"string:wire-key2", "string:second"});
  EXPECT_EQ(0, r.status) << r.err;
  EXPECT_EQ("", DBusSendBody(r));

  r = Gdbus("Fetch", {"wire-key"});
  EXPECT_EQ("('wire value',)\n", r.out);
  r = Gdbus("Fetch", {"wire-key2"});
  EXPECT_EQ("('second',)\n", r.out);
}

TEST_F(ServiceWire, TwoOutStringsInOrder) {
  RunResult r = DBusSend("Split", {"string:first and rest"});
  EXPECT_EQ(0, r.status) << r.err;
  EXPECT_EQ("   string \"first\"\n   string \"and rest\"\n", DBusSendBody(r));

  r = Gdbus("Split", {"single"});
  EXPECT_EQ("('single', '')\n", r.out);
}

TEST_F(ServiceWire, ThrowingHandlerIsAnsweredAsFalseWithoutError) {
  vorntest::SyslogCapture log;
  const std::string expected =
      GdbusError("org.freedesktop.DBus.GLib.ErrorError",
                 "Method invoked for Throw returned FALSE but did not set error");
  for (const char* kind : {"std", "int", "error"}) {
    SCOPED_TRACE(kind);
    RunResult r = Gdbus("Throw", {kind});
    EXPECT_EQ(1, r.status);
    EXPECT_EQ(expected, r.err);
  }
  // The service is still there.
  EXPECT_EQ("('echo:after',)\n", Gdbus("Echo", {"after"}).out);
  if (vorntest::SyslogCapture::Available()) {
    EXPECT_TRUE(log.HasOnce(
        LOG_ERR, vorntest::LogLine("dbus/dbus_server.cpp",
                                   "Handler of Throw threw an exception: thrown for std")))
        << log.Dump();
    EXPECT_TRUE(log.HasOnce(
        LOG_ERR, vorntest::LogLine("dbus/dbus_server.cpp", "Handler of Throw threw an exception")))
        << log.Dump();
  }
}

TEST_F(ServiceWire, InvalidUtf8OutIsRepaired) {
  vorntest::SyslogCapture log;
  RunResult r = Gdbus("BadUtf8");
  EXPECT_EQ(0, r.status) << r.err;
  EXPECT_EQ(
      "('a\xef\xbf\xbd"
      "b',)\n",
      r.out);
  if (vorntest::SyslogCapture::Available()) {
    EXPECT_TRUE(log.HasOnce(LOG_WARNING,
                            vorntest::LogLine("dbus/dbus_server.cpp",
                                              "Reply of BadUtf8 is not valid UTF-8; invalid bytes "
                                              "were replaced")))
        << log.Dump();
  }
}

TEST_F(ServiceWire, WrongArgumentsAndUnknownMethodsAreRefusedByTheBusLayer) {
  RunResult r = DBusSend("Echo", {"int32:3"});
  EXPECT_EQ(1, r.status);
  EXPECT_EQ(0u, r.err.find("Error org.freedesktop.DBus.Error.InvalidArgs: ")) << r.err;

  r = DBusSend("NoSuchMethod");
  EXPECT_EQ(1, r.status);
  EXPECT_EQ(0u, r.err.find("Error org.freedesktop.DBus.Error.UnknownMethod: ")) << r.err;
}

TEST_F(ServiceWire, IntrospectionListsMethodsWithArgumentNames) {
  RunResult r =
      vorntest::Run({kGdbus, "introspect", "--session", "--dest", kService, "--object-path", "/"});
  ASSERT_EQ(0, r.status) << r.err;
  const char* expected[] = {
      "  interface com.vornlink.test {\n    methods:\n      Echo(in  s text,\n           out s "
      "reply);\n",
      "      FailBadParameter(in  s devid);\n",
      "      NullOut(out s data);\n",
      "      SetPIN(in  s devid,\n             in  s oldpin,\n             in  s newpin,\n"
      "             in  b protection,\n             out s result);\n",
      "      Store(in  s key,\n            in  s value);\n",
      "      Split(in  s text,\n            out s first,\n            out s rest);\n",
      "      Quit();\n",
      "    signals:\n      Changed(s value);\n",
      "  interface org.freedesktop.DBus.Introspectable {\n",
  };
  for (const char* e : expected) EXPECT_NE(std::string::npos, r.out.find(e)) << e << "\n" << r.out;

  // The raw XML, as busctl and dbus-send see it.
  r = vorntest::Run({kDBusSend, "--session", "--print-reply=literal",
                     std::string("--dest=") + kService, "/",
                     "org.freedesktop.DBus.Introspectable.Introspect"});
  ASSERT_EQ(0, r.status) << r.err;
  EXPECT_NE(std::string::npos, r.out.find("<interface name=\"com.vornlink.test\">")) << r.out;
  EXPECT_NE(std::string::npos, r.out.find("<arg type=\"b\" name=\"protection\" direction=\"in\">"))
      << r.out;
}

// The replies of two calls, in the order they arrived.
struct Replies {
  std::vector<std::string> order;
  int pending = 0;
  GMainLoop* loop = nullptr;
};

void OnStringReply(GObject* source, GAsyncResult* result, gpointer data) {
  auto* replies = static_cast<Replies*>(data);
  GError* error = nullptr;
  GVariant* v = g_dbus_connection_call_finish(G_DBUS_CONNECTION(source), result, &error);
  if (v != nullptr) {
    const char* text = nullptr;
    g_variant_get(v, "(&s)", &text);
    replies->order.push_back(text);
    g_variant_unref(v);
  } else {
    replies->order.push_back(std::string("error: ") + error->message);
    g_error_free(error);
  }
  if (--replies->pending == 0) g_main_loop_quit(replies->loop);
}

// Both calls leave on one connection, so the service receives Sleep before Echo. Handlers that
// ran side by side would answer the echo while the sleeper still sleeps; one at a time, the
// sleeper's reply comes first (event order, no clock involved).
TEST_F(ServiceWire, HandlersRunOneAtATime) {
  GError* error = nullptr;
  GDBusConnection* bus = g_bus_get_sync(G_BUS_TYPE_SESSION, nullptr, &error);
  ASSERT_NE(nullptr, bus) << (error != nullptr ? error->message : "");
  GMainContext* context = g_main_context_new();
  g_main_context_push_thread_default(context);
  Replies replies;
  replies.loop = g_main_loop_new(context, FALSE);
  replies.pending = 2;
  g_dbus_connection_call(bus, kService, "/", "com.vornlink.test", "Sleep",
                         g_variant_new("(s)", "1500"), G_VARIANT_TYPE("(s)"),
                         G_DBUS_CALL_FLAGS_NONE, 60000, nullptr, OnStringReply, &replies);
  g_dbus_connection_call(bus, kService, "/", "com.vornlink.test", "Echo",
                         g_variant_new("(s)", "queued"), G_VARIANT_TYPE("(s)"),
                         G_DBUS_CALL_FLAGS_NONE, 60000, nullptr, OnStringReply, &replies);
  g_main_loop_run(replies.loop);  // both calls end: with a reply or their 60 s timeout
  g_main_loop_unref(replies.loop);
  g_main_context_pop_thread_default(context);
  g_main_context_unref(context);
  g_object_unref(bus);
  EXPECT_EQ((std::vector<std::string>{"slept", "echo:queued"}), replies.order);
}

TEST(EmbeddedXml, IsTheFileText) {
  ASSERT_FALSE(vorntest::SourceDir().empty()) << "VORN_SOURCE_DIR not set";
  std::string file =
      vorntest::ReadFile(vorntest::SourceDir() + "/tests/unit/platform_dbus/com.vornlink.test.xml");
  ASSERT_FALSE(file.empty());
  EXPECT_EQ(file, kTestIntrospectionXml);
}

TEST(ServiceLifecycle, SecondInstanceFailsToInitialize) {
  ServiceProcess first;
  ASSERT_TRUE(first.ready());
  vorntest::SyslogCapture log;
  ServiceProcess second;
  EXPECT_FALSE(second.ready());
  EXPECT_EQ(2, second.Wait(20));
  if (vorntest::SyslogCapture::Available()) {
    EXPECT_TRUE(log.HasOnce(
        LOG_ERR, vorntest::LogLine("dbus/dbus_server.cpp",
                                   "Name com.vornlink.test is already owned on the session bus")))
        << log.Dump();
  }
  // The first one still answers.
  EXPECT_EQ("('echo:first',)\n", Gdbus("Echo", {"first"}).out);
  EXPECT_EQ(0, first.Stop());
}

TEST(ServiceLifecycle, QuitFromAHandlerRepliesThenReleasesTheName) {
  ServiceProcess service;
  ASSERT_TRUE(service.ready());
  RunResult r = Gdbus("Quit");
  EXPECT_EQ(0, r.status) << r.err;
  EXPECT_EQ("()\n", r.out);
  EXPECT_EQ(0, service.Wait(20));
  EXPECT_FALSE(vorntest::NameHasOwner(kService));
}

TEST(ServiceLifecycle, SigtermQuitsTheLoop) {
  ServiceProcess service({"--name", "com.vornlink.test.term"}, "com.vornlink.test.term");
  ASSERT_TRUE(service.ready());
  EXPECT_EQ(0, service.Stop());
  EXPECT_FALSE(vorntest::NameHasOwner("com.vornlink.test.term"));
}

// A bus of our own that the test can take away under the service.
class PrivateBus {
 public:
  PrivateBus() {
    int fds[2];
    if (pipe(fds) != 0) return;
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_adddup2(&actions, fds[1], 1);
    posix_spawn_file_actions_addclose(&actions, fds[0]);
    posix_spawn_file_actions_addopen(&actions, 2, "/dev/null", O_WRONLY, 0);  // its fd-limit notice
    const char* argv[] = {"/usr/bin/dbus-daemon", "--session",         "--nofork",
                          "--nopidfile",          "--print-address=1", nullptr};
    if (posix_spawn(&pid_, argv[0], &actions, nullptr, const_cast<char**>(argv), environ) != 0) {
      pid_ = -1;
    }
    posix_spawn_file_actions_destroy(&actions);
    close(fds[1]);
    char buf[512];
    ssize_t n;
    while ((n = read(fds[0], buf, sizeof buf)) > 0) {
      address_.append(buf, static_cast<std::size_t>(n));
      if (address_.find('\n') != std::string::npos) break;
    }
    close(fds[0]);
    if (!address_.empty() && address_.back() == '\n') address_.pop_back();
  }
  ~PrivateBus() { Kill(); }
  void Kill() {
    if (pid_ > 0) {
      kill(pid_, SIGTERM);
      waitpid(pid_, nullptr, 0);
      pid_ = -1;
    }
  }
  const std::string& address() const { return address_; }

 private:
  pid_t pid_ = -1;
  std::string address_;
};

TEST(ServiceLifecycle, LosingTheBusEndsTheLoop) {
  PrivateBus bus;
  ASSERT_FALSE(bus.address().empty());
  const char* saved = std::getenv("DBUS_SESSION_BUS_ADDRESS");
  std::string previous = saved ? saved : "";
  setenv("DBUS_SESSION_BUS_ADDRESS", bus.address().c_str(), 1);
  auto service = std::make_unique<ServiceProcess>();
  bool ready = service->ready();
  if (saved)
    setenv("DBUS_SESSION_BUS_ADDRESS", previous.c_str(), 1);
  else
    unsetenv("DBUS_SESSION_BUS_ADDRESS");
  ASSERT_TRUE(ready);
  bus.Kill();
  EXPECT_EQ(3, service->Wait(20));
}

// ---- Servers inside the test process ----

const char kSmallXml[] = R"(<node>
  <interface name="com.vornlink.small">
    <method name="Hello">
      <arg name="who" type="s" direction="in"/>
      <arg name="greeting" type="s" direction="out"/>
    </method>
    <method name="Flag">
      <arg name="on" type="b" direction="in"/>
    </method>
  </interface>
</node>)";

struct Small {
  std::thread::id handlerThread;
};

gboolean small_hello(Small* s, const char* who, char** greeting, GError**) {
  s->handlerThread = std::this_thread::get_id();
  *greeting = g_strdup_printf("hello %s", who);
  return TRUE;
}
gboolean small_flag(Small*, gboolean, GError**) { return TRUE; }
gboolean small_flag_as_string(Small*, const char*, GError**) { return TRUE; }
gboolean small_flag_with_out(Small*, gboolean, char**, GError**) { return TRUE; }

std::string ServerLine(const std::string& message) {
  return vorntest::LogLine("dbus/dbus_server.cpp", message);
}

const DBusMethodEntry kSmallMethods[] = {
    VORN_DBUS_METHOD("Hello", small_hello),
    VORN_DBUS_METHOD("Flag", small_flag),
};
const DBusGObjectInfo kSmallInfo = {"com.vornlink.small", kSmallXml, kSmallMethods, 2};

// Initialize must fail, logging one line at LOG_ERR that matches `logged` (a regex).
bool InitFails(const DBusGObjectInfo& info, const std::string& logged, GType type = G_TYPE_INVALID,
               gpointer object = nullptr) {
  static Small small;
  vorntest::SyslogCapture log;
  DBusServer server("com.vornlink.test.bad", "/", DBUS_BUS_SESSION);
  bool ok = server.Initialize(type, &info, object ? object : &small);
  EXPECT_FALSE(server.IsInitialized());
  if (vorntest::SyslogCapture::Available()) {
    EXPECT_TRUE(log.HasOnce(LOG_ERR, logged)) << logged << "\n" << log.Dump();
  }
  EXPECT_FALSE(vorntest::NameHasOwner("com.vornlink.test.bad"));
  return !ok;
}

TEST(ServerInitialize, AcceptsAMatchingTable) {
  Small small;
  DBusServer server("com.vornlink.test.small", "/", DBUS_BUS_SESSION);
  EXPECT_FALSE(server.IsInitialized());
  ASSERT_TRUE(server.Initialize(G_TYPE_INVALID, &kSmallInfo, &small));
  EXPECT_TRUE(server.IsInitialized());
  EXPECT_TRUE(vorntest::NameHasOwner("com.vornlink.test.small"));
  EXPECT_FALSE(server.Initialize(G_TYPE_INVALID, &kSmallInfo, &small));  // only once
  EXPECT_TRUE(server.IsInitialized());
}

TEST(ServerInitialize, NameIsReleasedByTheDestructor) {
  Small small;
  {
    DBusServer server("com.vornlink.test.small", "/", DBUS_BUS_SESSION);
    ASSERT_TRUE(server.Initialize(G_TYPE_INVALID, &kSmallInfo, &small));
    EXPECT_TRUE(vorntest::NameHasOwner("com.vornlink.test.small"));
  }
  EXPECT_FALSE(vorntest::NameHasOwner("com.vornlink.test.small"));
}

TEST(ServerInitialize, RejectsAMethodWithoutHandler) {
  const DBusGObjectInfo info = {"com.vornlink.small", kSmallXml, kSmallMethods, 1};
  EXPECT_TRUE(InitFails(info, ServerLine("Method com.vornlink.small.Flag has no handler")));
}

TEST(ServerInitialize, RejectsAHandlerWithoutMethod) {
  const DBusMethodEntry methods[] = {
      VORN_DBUS_METHOD("Hello", small_hello),
      VORN_DBUS_METHOD("Flag", small_flag),
      VORN_DBUS_METHOD("Extra", small_flag),
  };
  const DBusGObjectInfo info = {"com.vornlink.small", kSmallXml, methods, 3};
  EXPECT_TRUE(InitFails(
      info, ServerLine("Handler for com.vornlink.small.Extra has no method in the interface")));
}

TEST(ServerInitialize, RejectsArgumentTypeMismatch) {
  const DBusMethodEntry methods[] = {
      VORN_DBUS_METHOD("Hello", small_hello),
      VORN_DBUS_METHOD("Flag", small_flag_as_string),
  };
  const DBusGObjectInfo info = {"com.vornlink.small", kSmallXml, methods, 2};
  EXPECT_TRUE(
      InitFails(info, ServerLine("Handler of com.vornlink.small.Flag takes (s) and gives (), "
                                 "the interface says (b) and ()")));
}

TEST(ServerInitialize, RejectsArityMismatch) {
  const DBusMethodEntry methods[] = {
      VORN_DBUS_METHOD("Hello", small_hello),
      VORN_DBUS_METHOD("Flag", small_flag_with_out),
  };
  const DBusGObjectInfo info = {"com.vornlink.small", kSmallXml, methods, 2};
  EXPECT_TRUE(
      InitFails(info, ServerLine("Handler of com.vornlink.small.Flag takes (b) and gives (s), "
                                 "the interface says (b) and ()")));
}

TEST(ServerInitialize, RejectsTwoHandlersForOneMethod) {
  const DBusMethodEntry methods[] = {
      VORN_DBUS_METHOD("Hello", small_hello),
      VORN_DBUS_METHOD("Flag", small_flag),
      VORN_DBUS_METHOD("Flag", small_flag),
  };
  const DBusGObjectInfo info = {"com.vornlink.small", kSmallXml, methods, 3};
  EXPECT_TRUE(InitFails(info, ServerLine("Method com.vornlink.small.Flag has two handlers")));
}

TEST(ServerInitialize, RejectsBrokenXmlAndMissingInterface) {
  const DBusGObjectInfo broken = {"com.vornlink.small", "<node><interface", kSmallMethods, 2};
  EXPECT_TRUE(InitFails(broken,
                        "^dbus/dbus_server\\.cpp:[0-9]+ Failed to parse the introspection "
                        "data of com\\.vornlink\\.test\\.bad: .+"));
  const DBusGObjectInfo other = {"com.vornlink.other", kSmallXml, kSmallMethods, 2};
  EXPECT_TRUE(
      InitFails(other, ServerLine("Interface com.vornlink.other is not in the introspection "
                                  "data of com.vornlink.test.bad")));
}

TEST(ServerInitialize, RejectsAnObjectOfTheWrongType) {
  GObject* object = static_cast<GObject*>(g_object_new(G_TYPE_OBJECT, nullptr));
  EXPECT_TRUE(InitFails(kSmallInfo,
                        ServerLine("Object for com.vornlink.test.bad is not a GApplication"),
                        G_TYPE_APPLICATION, object));
  g_object_unref(object);
}

TEST(ServerInitialize, KeepsAGObjectAliveWhileServing) {
  GObject* object = static_cast<GObject*>(g_object_new(G_TYPE_OBJECT, nullptr));
  bool finalized = false;
  g_object_weak_ref(
      object, [](gpointer flag, GObject*) { *static_cast<bool*>(flag) = true; }, &finalized);
  {
    DBusServer server("com.vornlink.test.small", "/", DBUS_BUS_SESSION);
    ASSERT_TRUE(server.Initialize(G_TYPE_OBJECT, &kSmallInfo, object));
    g_object_unref(object);
    EXPECT_FALSE(finalized);
  }
  EXPECT_TRUE(finalized);
}

TEST(ServerInitialize, RejectsInvalidNameAndPath) {
  Small small;
  DBusServer badName("not a name", "/", DBUS_BUS_SESSION);
  EXPECT_FALSE(badName.Initialize(G_TYPE_INVALID, &kSmallInfo, &small));
  DBusServer badPath("com.vornlink.test.small", "no/path", DBUS_BUS_SESSION);
  EXPECT_FALSE(badPath.Initialize(G_TYPE_INVALID, &kSmallInfo, &small));
  DBusServer noInfo("com.vornlink.test.small", "/", DBUS_BUS_SESSION);
  EXPECT_FALSE(noInfo.Initialize(G_TYPE_INVALID, nullptr, &small));
}

TEST(ServerInitialize, NameOwnedByAnotherProcessFails) {
  ServiceProcess other;
  ASSERT_TRUE(other.ready());
  Small small;
  DBusServer server(kService, "/", DBUS_BUS_SESSION);
  EXPECT_FALSE(server.Initialize(G_TYPE_INVALID, &kSmallInfo, &small));
  EXPECT_FALSE(server.IsInitialized());
  EXPECT_EQ("('echo:x',)\n", Gdbus("Echo", {"x"}).out);
}

TEST(ServerLoop, StartLoopNeedsInitialize) {
  DBusServer server("com.vornlink.test.small", "/", DBUS_BUS_SESSION);
  EXPECT_FALSE(server.StartLoop());
}

TEST(ServerLoop, HandlersRunOnTheLoopThreadAndQuitLoopFromAnotherThread) {
  Small small;
  DBusServer server("com.vornlink.test.small", "/", DBUS_BUS_SESSION);
  ASSERT_TRUE(server.Initialize(G_TYPE_INVALID, &kSmallInfo, &small));
  RunResult r;
  std::thread caller([&] {
    r = vorntest::Run({kGdbus, "call", "--session", "--dest", "com.vornlink.test.small",
                       "--object-path", "/", "--method", "com.vornlink.small.Hello", "loop"});
    server.QuitLoop();
  });
  EXPECT_TRUE(server.StartLoop());
  caller.join();
  EXPECT_EQ("('hello loop',)\n", r.out) << r.err;
  EXPECT_EQ(std::this_thread::get_id(), small.handlerThread);
}

TEST(ServerLoop, QuitBeforeStartIsNotLost) {
  Small small;
  DBusServer server("com.vornlink.test.small", "/", DBUS_BUS_SESSION);
  ASSERT_TRUE(server.Initialize(G_TYPE_INVALID, &kSmallInfo, &small));
  server.QuitLoop();
  EXPECT_TRUE(server.StartLoop());
}

TEST(ServerLoop, QuitFromASignalSource) {
  Small small;
  DBusServer server("com.vornlink.test.small", "/", DBUS_BUS_SESSION);
  ASSERT_TRUE(server.Initialize(G_TYPE_INVALID, &kSmallInfo, &small));
  guint source = g_unix_signal_add(
      SIGUSR1,
      [](gpointer s) -> gboolean {
        static_cast<DBusServer*>(s)->QuitLoop();
        return G_SOURCE_REMOVE;
      },
      &server);
  std::thread raiser([] {
    std::this_thread::sleep_for(std::chrono::milliseconds(100));
    kill(getpid(), SIGUSR1);
  });
  EXPECT_TRUE(server.StartLoop());
  raiser.join();
  (void)source;
}

TEST(ServerSignal, NeedsInitializeAndName) {
  DBusServer server("com.vornlink.test.small", "/", DBUS_BUS_SESSION);
  EXPECT_FALSE(server.SendSignal("x"));
  EXPECT_FALSE(server.NewSignal("not a member"));
  EXPECT_TRUE(server.NewSignal("Changed"));
  EXPECT_FALSE(server.SendSignal("x"));  // not initialized
}

}  // namespace
