// The twelve handlers of com.vornlink.usbmodem called as the bus calls them, over a registry of
// modems without hardware: usbmodem1 initialised and connected on ppp0, usbmodem2 initialised and
// disconnected, usbmodem3 not initialised. No modem has a node, so every AT exchange fails at
// once and no dialler is ever started.
#ifndef VORN_FUZZ_ENTRIES_USBMODEM_METHODS_H
#define VORN_FUZZ_ENTRIES_USBMODEM_METHODS_H

#include <json/json.h>

#include <string>
#include <vector>

#include "entries/fuzz_input.h"
#include "vornwireless/dbus_usbmodem/usbmodem_server.h"

namespace vornfuzz {

struct UsbmodemMethod {
  const char* name;
  int stringArgs;  // in strings besides the object (SetPIN also takes a boolean)
  bool hasReply;
};

inline UsbmodemMethod const& UsbmodemMethodAt(int index) {
  static const UsbmodemMethod kMethods[] = {
      {"Connect", 1, false},        {"Disconnect", 1, false},
      {"GetUSBModemList", 0, true}, {"GetUSBModem", 1, true},
      {"GetSimInfo", 1, true},      {"UnlockSIM", 2, false},
      {"SetPIN", 3, false},         {"GetProfile", 1, true},
      {"SetProfile", 2, false},     {"UnlockPIN", 3, false},
      {"GetUSBModemIfList", 0, true}, {"GetDevIdByIfName", 1, true},
  };
  return kMethods[index];
}
const int kUsbmodemMethodCount = 12;

// A modem in a chosen state without hardware.
class FuzzStateModem : public vornwireless::usbmodem_lib::USBModem {
 public:
  FuzzStateModem(unsigned id, bool inited, int net, std::string const& ifname)
      : USBModem(id, "") {
    _infoState = inited ? INFO_INITED : INFO_NOT_INITED;
    _netStatus = net;
    _ifName = ifname;
    _localIP = ifname.empty() ? "" : "10.0.0.1";
  }
};

struct UsbmodemAnswer {
  bool ok = false;
  bool hasError = false;
  std::string domain;
  int code = 0;
  std::string message;
  bool hasOut = false;
  std::string out;
};

// A fresh registry for every call, so that no input depends on the ones before it.
inline UsbmodemAnswer CallUsbmodemMethod(int index, std::vector<std::string> const& args,
                                         bool protection) {
  using namespace vornwireless::dbus;
  using vornwireless::usbmodem_lib::USBModem;
  USBModemObject* obj = static_cast<USBModemObject*>(g_object_new(usbmodem_object_get_type(),
                                                                  nullptr));
  const FuzzStateModem modems[] = {
      FuzzStateModem(1, true, USBModem::NET_CONNECTED, "ppp0"),
      FuzzStateModem(2, true, USBModem::NET_DISCONNECTED, ""),
      FuzzStateModem(3, false, USBModem::NET_DISCONNECTED, ""),
  };
  for (FuzzStateModem const& m : modems) {
    obj->list.push_back(USBModem(m.GetIfid(), ""));
    obj->list.back() = m;
  }
  const char* a0 = args.size() > 0 ? args[0].c_str() : "";
  const char* a1 = args.size() > 1 ? args[1].c_str() : "";
  const char* a2 = args.size() > 2 ? args[2].c_str() : "";
  Outcome o;
  gboolean ok = FALSE;
  switch (index) {
    case 0: ok = usbmodem_connect(obj, a0, &o.error); break;
    case 1: ok = usbmodem_disconnect(obj, a0, &o.error); break;
    case 2: ok = usbmodem_get_usbmodem_list(obj, &o.out, &o.error); break;
    case 3: ok = usbmodem_get_usbmodem(obj, a0, &o.out, &o.error); break;
    case 4: ok = usbmodem_get_sim_info(obj, a0, &o.out, &o.error); break;
    case 5: ok = usbmodem_unlock_sim(obj, a0, a1, &o.error); break;
    case 6: ok = usbmodem_set_pin(obj, a0, a1, a2, protection ? TRUE : FALSE, &o.error); break;
    case 7: ok = usbmodem_get_profile(obj, a0, &o.out, &o.error); break;
    case 8: ok = usbmodem_set_profile(obj, a0, a1, &o.error); break;
    case 9: ok = usbmodem_unlock_pin(obj, a0, a1, a2, &o.error); break;
    case 10: ok = usbmodem_get_usbmodem_if_list(obj, &o.out, &o.error); break;
    case 11: ok = usbmodem_get_devid_by_ifname(obj, a0, &o.out, &o.error); break;
    default: Broken("no such usbmodem method");
  }
  g_object_unref(obj);
  UsbmodemAnswer a;
  Require(ok == TRUE || ok == FALSE, "a gboolean answer");
  a.ok = ok == TRUE;
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

// The input as the method's arguments: its in strings split at NUL bytes; SetPIN's boolean is the
// low bit of the byte after them.
inline UsbmodemAnswer CallUsbmodemMethodWithInput(int index, const uint8_t* data, size_t size,
                                                  std::vector<std::string>& args) {
  const int n = UsbmodemMethodAt(index).stringArgs;
  std::vector<std::string> parts = SplitArgs(data, size, static_cast<size_t>(n) + 1);
  const bool protection = !parts.back().empty() && (parts.back()[0] & 1);
  parts.pop_back();
  args = parts;
  return CallUsbmodemMethod(index, args, protection);
}

// The contract of the handlers for this registry.
inline void CheckUsbmodemAnswer(int index, std::vector<std::string> const& args,
                                UsbmodemAnswer const& a) {
  UsbmodemMethod const& m = UsbmodemMethodAt(index);
  if (a.hasError) Require(a.domain == "error", "errors of domain \"error\"");
  if (index == 2) {
    Require(a.ok && !a.hasError && a.out == "usbmodem1\nusbmodem2\n", "the list of inited modems");
    return;
  }
  if (index == 10) {
    Require(a.ok && !a.hasError && a.hasOut, "the interface list");
    return;
  }
  if (index == 11) {
    Require(a.ok && !a.hasError && a.hasOut, "an answer for any interface name");
    Require(a.out.empty() || ((a.out == "usbmodem1" || a.out == "usbmodem2") &&
                              (args[0] == "ppp0" || args[0].empty())),
            "a device id only for a known interface");
    return;
  }
  const std::string& devid = args[0];
  const bool known = devid == "usbmodem1" || devid == "usbmodem2" || devid == "usbmodem3";
  if (!known) {
    Require(!a.ok && a.hasError && a.code == -1 &&
                a.message == "USBModem [" + devid + "] not found" && !a.hasOut,
            "an unknown modem is not found");
    return;
  }
  if (devid == "usbmodem3") {
    Require(!a.ok && a.hasError && a.code == -1 &&
                a.message == "USBModem [usbmodem3] not inited" && !a.hasOut,
            "a modem that is not inited");
    return;
  }
  if (a.ok) {
    Require(a.hasOut == m.hasReply, "a reply exactly for the queries");
    Require(!a.hasError || index == 3, "only GetUSBModem hands out data with an error");
  } else {
    Require(a.hasError && !a.hasOut, "a failure has an error and no reply");
  }
  if (a.hasOut) {
    Json::Value v;
    Json::CharReaderBuilder b;
    std::string errs;
    std::unique_ptr<Json::CharReader> r(b.newCharReader());
    Require(r->parse(a.out.data(), a.out.data() + a.out.size(), &v, &errs), "JSON out");
  }
}

}  // namespace vornfuzz

#endif
