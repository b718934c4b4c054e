#include "vornwireless/dbus_net/net_server.h"

#include <json/json.h>

#include <exception>
#include <string>

#include "vornplatform/log.h"
#include "vornwireless/network/module_manager.h"

// jsoncpp marks Json::Reader deprecated; it is the parser whose leniency our clients rely on.
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"

namespace vornnetwork {
namespace dbus {

namespace {

using network::module::MODULE_TYPE;
using network::module::ModuleManager;

const char kService[] = "com.vornlink.net";
const char kPath[] = "/";

void net_object_class_init(gpointer, gpointer) {}
void net_object_init(GTypeInstance*, gpointer) {}

GQuark Domain(const char* name) { return g_quark_from_static_string(name); }

// Step 1 of every handler: the wire never carries a null string, a direct caller might.
bool CheckParameter(NetObject const* object, const char* text, GError** error) {
  if (object != nullptr && text != nullptr) return true;
  VORN_LOG(LOG_ERR, "Bad parameter");
  g_set_error(error, Domain("badparameter"), 1, "Bad parameter");
  return false;
}

// Parses the JSON text of a request, comments allowed. A failure logs `what` and sets no error.
// The comments are not kept with the values: a reply built from request values would carry them
// back as they were written, an unterminated "/*" included, and would not parse.
// Text nested deeper than the reader's stack limit makes jsoncpp throw instead of failing: that
// is text we cannot parse, like any other.
bool Parse(const char* text, Json::Value& request, const char* what) {
  bool parsed = false;
  try {
    Json::Reader reader;
    parsed = reader.parse(text, request, false);
  } catch (std::exception const& e) {
    VORN_LOG(LOG_ERR, "Unparsable request: %s", e.what());
  }
  if (!parsed) {
    VORN_LOG(LOG_ERR, "%s", what);
    return false;
  }
  return true;
}

// One request through the manager to a module. `method` becomes the request's "method" member;
// with `reply` the module's response is handed back as styled text. A refusal, an absent module
// or a request member of the wrong JSON type (jsoncpp throws) logs `failure` and answers it as
// the error's text (`errorText` when that differs); the exception never leaves the handler.
gboolean Dispatch(const char* member, MODULE_TYPE type, const char* method, Json::Value& request,
                  char** reply, const char* failure, const char* errorText, GError** error) {
  ModuleManager* manager = &ModuleManager::GetInstance();
  if (manager == nullptr) {
    VORN_LOG(LOG_ERR, "failed to get network manager");
    g_set_error(error, Domain("error"), 1, "failed to get network manager");
    return FALSE;
  }
  int ret = -1;
  std::string text;
  try {
    if (!request.isObject() && !request.isNull()) {
      VORN_LOG(LOG_ERR, "Bad request for %s: a JSON object is expected", member);
    } else {
      request["method"] = method;
      Json::Value response;
      ret = manager->ProcessRequest(type, request, response);
      if (ret == 0 && reply != nullptr) text = response.toStyledString();
    }
  } catch (std::exception const& e) {
    VORN_LOG(LOG_ERR, "Bad request for %s: %s", member, e.what());
    ret = -1;
  } catch (...) {
    VORN_LOG(LOG_ERR, "Bad request for %s: unknown exception", member);
    ret = -1;
  }
  if (ret != 0) {
    VORN_LOG(LOG_ERR, "%s", failure);
    g_set_error(error, Domain("error"), 1, "%s", errorText ? errorText : failure);
    return FALSE;
  }
  if (reply != nullptr) *reply = g_strdup(text.c_str());
  return TRUE;
}

// The handlers whose in string is a JSON request for RouteModule.
gboolean RouteRequest(NetObject* object, const char* member, const char* info, const char* method,
                      char** reply, const char* failure, GError** error) {
  if (!CheckParameter(object, info, error)) return FALSE;
  Json::Value request;
  if (!Parse(info, request, "Failed to parse info")) return FALSE;
  return Dispatch(member, network::module::MODULE_ROUTE, method, request, reply, failure, nullptr,
                  error);
}

const vornnetsdk::dbus::DBusMethodEntry kMethods[] = {
    VORN_DBUS_METHOD("GetDeviceListData", net_get_device_list_data),
    VORN_DBUS_METHOD("SetDeviceListData", net_set_device_list_data),
    VORN_DBUS_METHOD("DelDeviceListData", net_del_device_list_data),
    VORN_DBUS_METHOD("GetGatewayListData", net_get_gateway_list_data),
    VORN_DBUS_METHOD("AddGatewayData", net_add_gateway_data),
    VORN_DBUS_METHOD("DelGatewayData", net_del_gateway_data),
    VORN_DBUS_METHOD("GetGatewayDataByInterface", net_get_gateway_data_by_interface),
    VORN_DBUS_METHOD("SetSlaveData", net_set_slave_data),
    VORN_DBUS_METHOD("CopyGatewayData", net_copy_gateway_data),
    VORN_DBUS_METHOD("RefreshGateway", net_refresh_gateway),
    VORN_DBUS_METHOD("ResetIPv6Module", net_reset_ipv6_module),
};

const vornnetsdk::dbus::DBusGObjectInfo kInfo = {kService, kNetIntrospectionXml, kMethods,
                                                 G_N_ELEMENTS(kMethods)};

}  // namespace

GType NetObjectGetType() {
  static gsize once = 0;
  if (g_once_init_enter(&once)) {
    GType type = g_type_register_static_simple(
        G_TYPE_OBJECT, g_intern_static_string("VornNetObject"), sizeof(NetObjectClass),
        net_object_class_init, sizeof(NetObject), net_object_init, GTypeFlags(0));
    g_once_init_leave(&once, type);
  }
  return static_cast<GType>(once);
}

const vornnetsdk::dbus::DBusGObjectInfo* NetObjectInfo() { return &kInfo; }

NetServer::NetServer()
    : vornnetsdk::dbus::DBusServer(kService, kPath, vornnetsdk::dbus::DBUS_BUS_SESSION),
      _object(nullptr) {
  _object = G_OBJECT(g_object_new(NetObjectGetType(), nullptr));
  Initialize(NetObjectGetType(), &kInfo, _object);
}

NetServer::~NetServer() {
  if (_object != nullptr) g_object_unref(_object);
}

gboolean net_get_device_list_data(NetObject* object, const char* type, char** data,
                                  GError** error) {
  if (!CheckParameter(object, type, error)) return FALSE;
  Json::Value request(Json::objectValue);
  request["scannertype"] = type;
  return Dispatch("GetDeviceListData", network::module::MODULE_DEVICELIST, "get", request, data,
                  "failed to get upnp data", nullptr, error);
}

gboolean net_set_device_list_data(NetObject* object, const char* data, GError** error) {
  if (!CheckParameter(object, data, error)) return FALSE;
  Json::Value request;
  if (!Parse(data, request, "Failed to parse device data")) return FALSE;
  return Dispatch("SetDeviceListData", network::module::MODULE_DEVICELIST, "set", request, nullptr,
                  "failed to set device type", nullptr, error);
}

gboolean net_del_device_list_data(NetObject* object, const char* mac, GError** error) {
  if (!CheckParameter(object, mac, error)) return FALSE;
  Json::Value request(Json::objectValue);
  request["macAddr"] = mac;
  return Dispatch("DelDeviceListData", network::module::MODULE_DEVICELIST, "del", request, nullptr,
                  "failed to delete data", "failed to set delete data", error);
}

gboolean net_get_gateway_list_data(NetObject* object, const char* info, char** data,
                                   GError** error) {
  return RouteRequest(object, "GetGatewayListData", info, "GET_GATEWAY_LIST_DATA", data,
                      "failed to get gateway list data", error);
}

gboolean net_add_gateway_data(NetObject* object, const char* info, GError** error) {
  return RouteRequest(object, "AddGatewayData", info, "ADD_GATEWAY_DATA", nullptr,
                      "failed to add gateway data", error);
}

gboolean net_del_gateway_data(NetObject* object, const char* info, GError** error) {
  return RouteRequest(object, "DelGatewayData", info, "DEL_GATEWAY_DATA", nullptr,
                      "failed to del gateway data", error);
}

gboolean net_get_gateway_data_by_interface(NetObject* object, const char* info, char** data,
                                           GError** error) {
  return RouteRequest(object, "GetGatewayDataByInterface", info, "GET_GATEWAY_DATA_BY_INTERFACE",
                      data, "failed to get gateway list data", error);
}

gboolean net_set_slave_data(NetObject* object, const char* info, GError** error) {
  return RouteRequest(object, "SetSlaveData", info, "SET_SLAVE_DATA", nullptr,
                      "failed to set slave data", error);
}

gboolean net_copy_gateway_data(NetObject* object, const char* info, GError** error) {
  return RouteRequest(object, "CopyGatewayData", info, "COPY_GATEWAY_DATA", nullptr,
                      "failed to copy gateway data", error);
}

gboolean net_refresh_gateway(NetObject* object, const char* type, GError** error) {
  return RouteRequest(object, "RefreshGateway", type, "REFRESH_GATEWAY", nullptr,
                      "failed to refresh gateway", error);
}

gboolean net_reset_ipv6_module(NetObject* object, const char* info, GError** error) {
  if (!CheckParameter(object, info, error)) return FALSE;
  Json::Value request(Json::objectValue);
  request["ifname"] = info;
  return Dispatch("ResetIPv6Module", network::module::MODULE_IPV6, "RESET_IPV6_MODULE", request,
                  nullptr, "failed to reset ipv6 module", nullptr, error);
}

}  // namespace dbus
}  // namespace vornnetwork
