// The eleven handlers of com.vornlink.net called as the bus calls them, over the in-memory
// recording modules of the unit tests (no module runs a program or writes a file).
#ifndef VORN_FUZZ_ENTRIES_NET_METHODS_H
#define VORN_FUZZ_ENTRIES_NET_METHODS_H

#include <json/json.h>

#include <string>

#include "entries/fuzz_input.h"
#include "unit/dbus_net/fake_modules.h"
#include "vornwireless/dbus_net/net_server.h"

namespace vornfuzz {

struct NetMethod {
  const char* name;
  bool hasReply;
  bool jsonArgument;  // the in string is parsed as JSON (else taken as a plain string)
  const char* failure;  // the error text when the module refuses
};

// Table order of the service.
inline NetMethod const& NetMethodAt(int index) {
  static const NetMethod kMethods[] = {
      {"GetDeviceListData", true, false, "failed to get upnp data"},
      {"SetDeviceListData", false, true, "failed to set device type"},
      {"DelDeviceListData", false, false, "failed to set delete data"},
      {"GetGatewayListData", true, true, "failed to get gateway list data"},
      {"AddGatewayData", false, true, "failed to add gateway data"},
      {"DelGatewayData", false, true, "failed to del gateway data"},
      {"GetGatewayDataByInterface", true, true, "failed to get gateway list data"},
      {"SetSlaveData", false, true, "failed to set slave data"},
      {"CopyGatewayData", false, true, "failed to copy gateway data"},
      {"RefreshGateway", false, true, "failed to refresh gateway"},
      {"ResetIPv6Module", false, false, "failed to reset ipv6 module"},
  };
  return kMethods[index];
}
const int kNetMethodCount = 11;

struct NetAnswer {
  bool ok = false;
  bool hasError = false;
  std::string domain;
  int code = 0;
  std::string message;
  bool hasOut = false;
  std::string out;
};

// The recording modules, added once per process.
inline void EnsureRecordingModules() {
  static bool added = vorntest::AddRecordingModules() && atexit([] {
    vorntest::RemoveRecordingModules();
  }) == 0;
  Require(added, "recording modules added");
}

// One call of handler `index` with the in string `arg`, as the bus would make it.
inline NetAnswer CallNetMethod(int index, std::string const& arg) {
  using namespace vornnetwork::dbus;
  EnsureRecordingModules();
  static NetObject* object = static_cast<NetObject*>(g_object_new(NetObjectGetType(), nullptr));
  Outcome o;
  const char* in = arg.c_str();
  gboolean ok = FALSE;
  switch (index) {
    case 0: ok = net_get_device_list_data(object, in, &o.out, &o.error); break;
    case 1: ok = net_set_device_list_data(object, in, &o.error); break;
    case 2: ok = net_del_device_list_data(object, in, &o.error); break;
    case 3: ok = net_get_gateway_list_data(object, in, &o.out, &o.error); break;
    case 4: ok = net_add_gateway_data(object, in, &o.error); break;
    case 5: ok = net_del_gateway_data(object, in, &o.error); break;
    case 6: ok = net_get_gateway_data_by_interface(object, in, &o.out, &o.error); break;
    case 7: ok = net_set_slave_data(object, in, &o.error); break;
    case 8: ok = net_copy_gateway_data(object, in, &o.error); break;
    case 9: ok = net_refresh_gateway(object, in, &o.error); break;
    case 10: ok = net_reset_ipv6_module(object, in, &o.error); break;
    default: Broken("no such net method");
  }
  NetAnswer a;
  a.ok = ok == TRUE;
  Require(ok == TRUE || ok == FALSE, "a gboolean answer");
  if (o.error != nullptr) {
    a.hasError = true;
    a.domain = g_quark_to_string(o.error->domain);
    a.code = o.error->code;
    a.message = o.error->message;
  }
  if (o.out != nullptr) {
    a.hasOut = true;
    a.out = o.out;
  }
  return a;
}

// The handler's contract: success carries no error and, for a query, JSON text; a failure carries
// no reply and either no error (text that is not JSON) or the method's failure text.
inline void CheckNetAnswer(int index, std::string const& arg, NetAnswer const& a) {
  NetMethod const& m = NetMethodAt(index);
  if (a.ok) {
    Require(!a.hasError, "success without an error");
    Require(a.hasOut == m.hasReply, "a reply exactly for the queries");
    if (a.hasOut) {
      Json::Value v;
      Json::CharReaderBuilder b;
      std::string errs;
      std::unique_ptr<Json::CharReader> r(b.newCharReader());
      Require(r->parse(a.out.data(), a.out.data() + a.out.size(), &v, &errs) && v.isObject(),
              "the reply is a JSON object");
    }
    return;
  }
  Require(!a.hasOut, "no reply with a failure");
  if (!a.hasError) {
    Require(m.jsonArgument, "only a JSON argument fails without an error");
    Json::Value v;
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"
    Json::Reader reader;
    bool parsed = false;
    try {
      parsed = reader.parse(arg, v, true);
    } catch (std::exception const&) {
      // too deeply nested for the reader: not JSON to us
    }
    Require(!parsed, "no error only for text that is not JSON");
#pragma GCC diagnostic pop
    return;
  }
  Require(a.domain == "error" && a.code == 1 && a.message == m.failure,
          "the method's failure text");
}

}  // namespace vornfuzz

#endif
