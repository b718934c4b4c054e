// vorn-test-net-service: the real NetServer over recording modules (fake_modules.h), for the
// client-side tests. With --garbage it serves the same interface with handlers whose replies are
// not JSON, for the clients' parse failures. Writes no pid file. Exit status 0 after SIGTERM, 2
// when the name is taken.
#include <glib-unix.h>
#include <signal.h>
#include <syslog.h>

#include <cstring>

#include "fake_modules.h"
#include "vornwireless/dbus_net/net_server.h"

namespace {

using vornnetwork::dbus::NetObject;

gboolean OnSignal(gpointer server) {
  static_cast<vornnetsdk::dbus::DBusServer*>(server)->QuitLoop();
  return G_SOURCE_CONTINUE;
}

gboolean garbage_reply(NetObject*, const char*, char** data, GError**) {
  *data = g_strdup("this is { not json");
  return TRUE;
}
gboolean garbage_ok(NetObject*, const char*, GError**) { return TRUE; }

const vornnetsdk::dbus::DBusMethodEntry kGarbage[] = {
    VORN_DBUS_METHOD("GetDeviceListData", garbage_reply),
    VORN_DBUS_METHOD("SetDeviceListData", garbage_ok),
    VORN_DBUS_METHOD("DelDeviceListData", garbage_ok),
    VORN_DBUS_METHOD("GetGatewayListData", garbage_reply),
    VORN_DBUS_METHOD("AddGatewayData", garbage_ok),
    VORN_DBUS_METHOD("DelGatewayData", garbage_ok),
    VORN_DBUS_METHOD("GetGatewayDataByInterface", garbage_reply),
    VORN_DBUS_METHOD("SetSlaveData", garbage_ok),
    VORN_DBUS_METHOD("CopyGatewayData", garbage_ok),
    VORN_DBUS_METHOD("RefreshGateway", garbage_ok),
    VORN_DBUS_METHOD("ResetIPv6Module", garbage_ok),
};
const vornnetsdk::dbus::DBusGObjectInfo kGarbageInfo = {"com.vornlink.net", kNetIntrospectionXml,
                                                        kGarbage, G_N_ELEMENTS(kGarbage)};

int Serve(vornnetsdk::dbus::DBusServer& server) {
  guint term = g_unix_signal_add(SIGTERM, OnSignal, &server);
  server.StartLoop();
  g_source_remove(term);
  return 0;
}

}  // namespace

int main(int argc, char** argv) {
  openlog("vorn-test-net-service", LOG_PID, LOG_USER);
  if (argc > 1 && std::strcmp(argv[1], "--garbage") == 0) {
    vornnetsdk::dbus::DBusServer server("com.vornlink.net", "/",
                                        vornnetsdk::dbus::DBUS_BUS_SESSION);
    GObject* object = G_OBJECT(g_object_new(vornnetwork::dbus::NetObjectGetType(), nullptr));
    bool ok = server.Initialize(vornnetwork::dbus::NetObjectGetType(), &kGarbageInfo, object);
    g_object_unref(object);
    return ok ? Serve(server) : 2;
  }
  vornnetwork::dbus::NetServer server;
  if (!server.IsInitialized()) return 2;
  vorntest::AddRecordingModules();
  int status = Serve(server);
  vorntest::RemoveRecordingModules();
  return status;
}
