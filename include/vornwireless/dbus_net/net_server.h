// NetServer: the network daemon's D-Bus service "com.vornlink.net" at "/". Every method takes JSON
// text (or a plain string), adds the "method" member and hands the request to one module through
// ModuleManager::ProcessRequest; queries answer the module's response as styled JSON text.
#ifndef VORNWIRELESS_DBUS_NET_NET_SERVER_H
#define VORNWIRELESS_DBUS_NET_NET_SERVER_H

#include <glib-object.h>

#include "vornplatform/dbus.h"

// The interface's introspection XML, compiled into the library from dist/dbus.
extern const char kNetIntrospectionXml[];

namespace vornnetwork {
namespace dbus {

// The object exported at "/": a plain GObject, the handlers' first argument.
struct NetObject {
  GObject parent;
};
struct NetObjectClass {
  GObjectClass parent;
};
GType NetObjectGetType();

// The object information: interface, XML and the eleven handlers in table order.
const vornnetsdk::dbus::DBusGObjectInfo* NetObjectInfo();

class NetServer : public vornnetsdk::dbus::DBusServer {
 public:
  // Connects to the session bus, exports the object and owns "com.vornlink.net". Check
  // IsInitialized(): false when the bus is missing or the name is taken.
  NetServer();
  ~NetServer() override;

 private:
  GObject* _object;
};

// The handlers the server calls, one per method. Each returns FALSE with "Bad parameter"
// (domain "badparameter", code 1) for a null object or in string, FALSE without an error for text
// that is not JSON, and FALSE with the method's failure text (domain "error", code 1) when the
// module refuses, is absent, or the request has members of the wrong JSON type.
gboolean net_get_device_list_data(NetObject* object, const char* type, char** data, GError** error);
gboolean net_set_device_list_data(NetObject* object, const char* data, GError** error);
gboolean net_del_device_list_data(NetObject* object, const char* mac, GError** error);
gboolean net_get_gateway_list_data(NetObject* object, const char* info, char** data,
                                   GError** error);
gboolean net_add_gateway_data(NetObject* object, const char* info, GError** error);
gboolean net_del_gateway_data(NetObject* object, const char* info, GError** error);
gboolean net_get_gateway_data_by_interface(NetObject* object, const char* info, char** data,
                                           GError** error);
gboolean net_set_slave_data(NetObject* object, const char* info, GError** error);
gboolean net_copy_gateway_data(NetObject* object, const char* info, GError** error);
gboolean net_refresh_gateway(NetObject* object, const char* type, GError** error);
gboolean net_reset_ipv6_module(NetObject* object, const char* info, GError** error);

}  // namespace dbus
}  // namespace vornnetwork

#endif
