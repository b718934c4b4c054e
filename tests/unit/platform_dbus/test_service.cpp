// vorn-test-dbus-service: a DBusServer with one handler per reply rule, for the tests to call with
// gdbus, dbus-send and DBusClient. Serves com.vornlink.test (or the name given with --name) at "/".
// Exit status: 0 after Quit or SIGTERM, 2 when Initialize fails, 3 when the bus went away.
#include <glib-unix.h>
#include <signal.h>
#include <syslog.h>

#include <cstring>
#include <map>
#include <stdexcept>
#include <string>

#include "vornplatform/dbus.h"

extern const char kTestIntrospectionXml[];

namespace {

using vornnetsdk::dbus::DBusGObjectInfo;
using vornnetsdk::dbus::DBusMethodEntry;
using vornnetsdk::dbus::DBusServer;

struct TestState {
  DBusServer* server = nullptr;
  std::map<std::string, std::string> store;
};

// The exported object: a plain GObject carrying the state, as the product's servers do.
struct TestObject {
  GObject parent;
  TestState* state;
};
struct TestObjectClass {
  GObjectClass parent;
};

void test_object_class_init(gpointer, gpointer) {}
void test_object_init(GTypeInstance*, gpointer) {}

GType TestObjectType() {
  static GType type = 0;
  if (!type) {
    type = g_type_register_static_simple(G_TYPE_OBJECT, g_intern_static_string("VornTestObject"),
                                         sizeof(TestObjectClass), test_object_class_init,
                                         sizeof(TestObject), test_object_init, GTypeFlags(0));
  }
  return type;
}

GQuark Domain(const char* name) { return g_quark_from_static_string(name); }

gboolean test_echo(TestObject*, const char* text, char** reply, GError**) {
  *reply = g_strdup_printf("echo:%s", text);
  return TRUE;
}

gboolean test_fail_bad_parameter(TestObject*, const char*, GError** error) {
  g_set_error(error, Domain("badparameter"), 1, "Bad parameter");
  return FALSE;
}

gboolean test_fail_not_found(TestObject*, const char* devid, GError** error) {
  g_set_error(error, Domain("error"), -1, "USBModem [%s] not found", devid);
  return FALSE;
}

gboolean test_fail_code2(TestObject*, const char* devid, GError** error) {
  g_set_error(error, Domain("error"), 2, "Failed to unlock PIN [%s]", devid);
  return FALSE;
}

gboolean test_fail_without_error(TestObject*, const char*, GError**) { return FALSE; }

gboolean test_partial_data(TestObject*, const char* devid, char** usbmodem, GError** error) {
  *usbmodem = g_strdup_printf("{\"devid\" : \"%s\"}", devid);
  g_set_error(error, Domain("error"), -1, "USBModem error detected when get usbmodem data");
  return TRUE;
}

gboolean test_null_out(TestObject*, char**, GError**) { return TRUE; }

gboolean test_set_pin(TestObject*, const char* devid, const char* oldpin, const char* newpin,
                      gboolean protection, char** result, GError**) {
  *result = g_strdup_printf("%s:%s:%s:%s", devid, oldpin, newpin, protection ? "on" : "off");
  return TRUE;
}

gboolean test_throw(TestObject*, const char* kind, char** data, GError** error) {
  *data = g_strdup("never sent");
  if (std::strcmp(kind, "error") == 0) {
    g_set_error(error, Domain("error"), 5, "set before the throw");
  }
  if (std::strcmp(kind, "int") == 0) throw 42;
  throw std::runtime_error(std::string("thrown for ") + kind);
}

gboolean test_store(TestObject* object, const char* key, const char* value, GError** error) {
  if (!*key) {
    g_set_error(error, Domain("badparameter"), 1, "Bad parameter");
    return FALSE;
  }
  object->state->store[key] = value;
  return TRUE;
}

gboolean test_fetch(TestObject* object, const char* key, char** value, GError** error) {
  auto it = object->state->store.find(key);
  if (it == object->state->store.end()) {
    g_set_error(error, Domain("some-domain_name"), 7, "No value for [%s]", key);
    return FALSE;
  }
  *value = g_strdup(it->second.c_str());
  return TRUE;
}

gboolean test_split(TestObject*, const char* text, char** first, char** rest, GError**) {
  const char* sp = std::strchr(text, ' ');
  if (!sp) {
    *first = g_strdup(text);  // rest stays NULL: sent as ""
    return TRUE;
  }
  *first = g_strndup(text, static_cast<gsize>(sp - text));
  *rest = g_strdup(sp + 1);
  return TRUE;
}

gboolean test_sleep(TestObject*, const char* ms, char** done, GError**) {
  g_usleep(static_cast<gulong>(g_ascii_strtoull(ms, nullptr, 10)) * 1000);
  *done = g_strdup("slept");
  return TRUE;
}

gboolean test_bad_utf8(TestObject*, char** data, GError**) {
  *data = g_strdup(
      "a\xff"
      "b");
  return TRUE;
}

gboolean test_emit(TestObject* object, const char* value, GError** error) {
  DBusServer* server = object->state->server;
  if (!server->NewSignal("Changed") || !server->SendSignal(value)) {
    g_set_error(error, Domain("error"), -1, "Failed to send signal");
    return FALSE;
  }
  return TRUE;
}

gboolean test_quit(TestObject* object, GError**) {
  object->state->server->QuitLoop();
  return TRUE;
}

const DBusMethodEntry kMethods[] = {
    VORN_DBUS_METHOD("Echo", test_echo),
    VORN_DBUS_METHOD("FailBadParameter", test_fail_bad_parameter),
    VORN_DBUS_METHOD("FailNotFound", test_fail_not_found),
    VORN_DBUS_METHOD("FailCode2", test_fail_code2),
    VORN_DBUS_METHOD("FailWithoutError", test_fail_without_error),
    VORN_DBUS_METHOD("PartialData", test_partial_data),
    VORN_DBUS_METHOD("NullOut", test_null_out),
    VORN_DBUS_METHOD("SetPIN", test_set_pin),
    VORN_DBUS_METHOD("Throw", test_throw),
    VORN_DBUS_METHOD("Store", test_store),
    VORN_DBUS_METHOD("Fetch", test_fetch),
    VORN_DBUS_METHOD("Split", test_split),
    VORN_DBUS_METHOD("Sleep", test_sleep),
    VORN_DBUS_METHOD("BadUtf8", test_bad_utf8),
    VORN_DBUS_METHOD("Emit", test_emit),
    VORN_DBUS_METHOD("Quit", test_quit),
};

const DBusGObjectInfo kInfo = {"com.vornlink.test", kTestIntrospectionXml, kMethods,
                               G_N_ELEMENTS(kMethods)};

gboolean OnSignal(gpointer server) {
  static_cast<DBusServer*>(server)->QuitLoop();
  return G_SOURCE_CONTINUE;
}

}  // namespace

int main(int argc, char** argv) {
  const char* name = "com.vornlink.test";
  for (int i = 1; i + 1 < argc; ++i) {
    if (std::strcmp(argv[i], "--name") == 0) name = argv[i + 1];
  }
  openlog("vorn-test-dbus-service", LOG_PID, LOG_USER);
  g_log_set_always_fatal(static_cast<GLogLevelFlags>(G_LOG_LEVEL_CRITICAL | G_LOG_LEVEL_WARNING));

  TestState state;
  DBusServer server(name, "/", vornnetsdk::dbus::DBUS_BUS_SESSION);
  state.server = &server;
  auto* object = static_cast<TestObject*>(g_object_new(TestObjectType(), nullptr));
  object->state = &state;

  int status = 0;
  if (!server.Initialize(TestObjectType(), &kInfo, object)) {
    status = 2;
  } else {
    guint term = g_unix_signal_add(SIGTERM, OnSignal, &server);
    guint intr = g_unix_signal_add(SIGINT, OnSignal, &server);
    if (!server.StartLoop()) status = 3;
    g_source_remove(term);
    g_source_remove(intr);
  }
  g_object_unref(object);
  return status;
}
