// com.vornlink.usbmodem on the session bus: the modem registry behind twelve methods, and the
// 10-second polling tick that finds dongles and auto-connects new ones.
#include "vornwireless/dbus_usbmodem/usbmodem_server.h"

#include <unistd.h>

#include <exception>
#include <new>
#include <string>

#include "vornplatform/log.h"

using vornwireless::usbmodem_lib::USBModem;
using vornwireless::usbmodem_lib::USBModemList;

namespace vornwireless {
namespace dbus {

namespace {

// Logs the message and hands it to the caller as the method's error.
#define USBMODEM_FAIL(error, domain, code, fmt, ...)                                          \
  do {                                                                                         \
    VORN_LOG(LOG_ERR, fmt, ##__VA_ARGS__);                                                     \
    if ((error) && !*(error)) {                                                                \
      g_set_error((error), g_quark_from_static_string(domain), (code), fmt, ##__VA_ARGS__);    \
    }                                                                                          \
  } while (0)

GObjectClass* usbmodem_object_parent_class = nullptr;

void usbmodem_object_finalize(GObject* object) {
  reinterpret_cast<USBModemObject*>(object)->list.~USBModemList();
  usbmodem_object_parent_class->finalize(object);
}

void usbmodem_object_class_init(gpointer klass, gpointer) {
  usbmodem_object_parent_class = G_OBJECT_CLASS(g_type_class_peek_parent(klass));
  // The registry is a C++ object: it is built with the instance and destroyed with it.
  G_OBJECT_CLASS(klass)->finalize = usbmodem_object_finalize;
}

void usbmodem_object_init(GTypeInstance* instance, gpointer) {
  new (&reinterpret_cast<USBModemObject*>(instance)->list) USBModemList();
}

// Runs a handler body; an exception ends the call as the method's failure.
template <typename Body>
gboolean Guarded(const char* method, GError** error, Body body) {
  try {
    return body();
  } catch (std::exception const& e) {
    VORN_LOG(LOG_ERR, "Exception in %s: %s", method, e.what());
  } catch (...) {
    VORN_LOG(LOG_ERR, "Exception in %s", method);
  }
  if (error && !*error) {
    g_set_error(error, g_quark_from_static_string("error"), -1, "Failed to run %s", method);
  }
  return FALSE;
}

// Text that may be handed to the modem or the dialler: printable ASCII without double quote.
bool IsSafeText(const char* text) {
  for (const unsigned char* p = reinterpret_cast<const unsigned char*>(text); *p; ++p) {
    if (*p < 0x20 || *p >= 0x7f || *p == '"') return false;
  }
  return true;
}

bool IsSafeProfileText(std::string const& text, bool modemText) {
  for (unsigned char c : text) {
    if (c < 0x20 || c == 0x7f) return false;
    if (modemText && (c >= 0x7f || c == '"' || c == ';')) return false;
  }
  return true;
}

// A profile object whose members are texts or booleans, all free of line breaks and control
// characters, with the texts that reach the modem (apn, number) free of quotes and semicolons
// as well, and keys that can stand in the profile file.
bool IsAcceptableProfile(Json::Value const& value) {
  if (!value.isObject()) return false;
  for (std::string const& name : value.getMemberNames()) {
    // A key becomes a line of the profile file.
    if (name.empty() || !IsSafeProfileText(name, false) || name.find('=') != std::string::npos ||
        name.find('[') != std::string::npos) {
      return false;
    }
    Json::Value const& member = value[name];
    if (member.isBool()) continue;
    if (!member.isString()) return false;
    bool modemText = name == "apn" || name == "number";
    if (!IsSafeProfileText(member.asString(), modemText)) return false;
  }
  return true;
}

// The common start of the methods that name a modem: the object and every string present, the
// modem known and initialised. Null with the error set otherwise.
USBModem* Preamble(USBModemObject* obj, const char* devid, std::initializer_list<const char*> args,
                   GError** error) {
  bool bad = !obj || !devid;
  for (const char* arg : args) bad = bad || !arg;
  if (bad) {
    USBMODEM_FAIL(error, "badparameter", 1, "Bad parameter");
    return nullptr;
  }
  USBModem& modem = obj->list.FindUSBModem(std::string(devid));
  if (modem.IsNull()) {
    USBMODEM_FAIL(error, "error", -1, "USBModem [%s] not found", devid);
    return nullptr;
  }
  if (!modem.IsInited()) {
    USBMODEM_FAIL(error, "error", -1, "USBModem [%s] not inited", devid);
    return nullptr;
  }
  return &modem;
}

}  // namespace

GType usbmodem_object_get_type() {
  static GType type = 0;
  if (!type) {
    type = g_type_register_static_simple(
        G_TYPE_OBJECT, g_intern_static_string("USBModemObject"), sizeof(USBModemObjectClass),
        usbmodem_object_class_init, sizeof(USBModemObject), usbmodem_object_init, GTypeFlags(0));
  }
  return type;
}

gboolean usbmodem_connect(USBModemObject* obj, const char* devid, GError** error) {
  return Guarded("Connect", error, [&]() -> gboolean {
    USBModem* modem = Preamble(obj, devid, {}, error);
    if (!modem) return FALSE;
    if (modem->NetConnect(1) != 1) {
      USBMODEM_FAIL(error, "error", -1, "Failed to connect [%s]", devid);
      return FALSE;
    }
    return TRUE;
  });
}

gboolean usbmodem_disconnect(USBModemObject* obj, const char* devid, GError** error) {
  return Guarded("Disconnect", error, [&]() -> gboolean {
    USBModem* modem = Preamble(obj, devid, {}, error);
    if (!modem) return FALSE;
    if (modem->NetDisconnect() < 0) {
      USBMODEM_FAIL(error, "error", -1, "Failed to disconnect [%s]", devid);
      return FALSE;
    }
    return TRUE;
  });
}

gboolean usbmodem_get_usbmodem_list(USBModemObject* obj, char** usbmodem_list, GError** error) {
  return Guarded("GetUSBModemList", error, [&]() -> gboolean {
    if (!obj || !usbmodem_list) {
      USBMODEM_FAIL(error, "badparameter", 1, "Bad parameter");
      return FALSE;
    }
    std::string text;
    for (USBModem& modem : obj->list) {
      if (!modem.IsNull() && modem.IsInited()) text += modem.GetDevId() + "\n";
    }
    *usbmodem_list = g_strdup(text.c_str());
    return TRUE;
  });
}

gboolean usbmodem_get_usbmodem(USBModemObject* obj, const char* devid, char** usbmodem,
                               GError** error) {
  return Guarded("GetUSBModem", error, [&]() -> gboolean {
    USBModem* modem = Preamble(obj, devid, {}, error);
    if (!modem) return FALSE;
    if (!usbmodem) {
      USBMODEM_FAIL(error, "badparameter", 1, "Bad parameter");
      return FALSE;
    }
    modem->UpdateNetStatus();
    bool flag = false;
    Json::Value data = modem->GetUSBModemData(flag);
    *usbmodem = g_strdup(data.toStyledString().c_str());
    if (flag) {
      VORN_LOG(LOG_WARNING, "USBModem error detected when get usbmodem data");
      if (error && !*error) {
        g_set_error(error, g_quark_from_static_string("error"), -1,
                    "USBModem error detected when get usbmodem data");
      }
    }
    return TRUE;
  });
}

gboolean usbmodem_get_sim_info(USBModemObject* obj, const char* devid, char** usbmodem,
                               GError** error) {
  return Guarded("GetSimInfo", error, [&]() -> gboolean {
    USBModem* modem = Preamble(obj, devid, {}, error);
    if (!modem) return FALSE;
    if (!usbmodem) {
      USBMODEM_FAIL(error, "badparameter", 1, "Bad parameter");
      return FALSE;
    }
    bool flag = false;
    Json::Value info = modem->GetSimInfo(flag);
    if (flag) {
      USBMODEM_FAIL(error, "error", -1, "USBModem error detected when get usbmodem sim info");
      return FALSE;
    }
    *usbmodem = g_strdup(info.toStyledString().c_str());
    return TRUE;
  });
}

gboolean usbmodem_unlock_sim(USBModemObject* obj, const char* devid, const char* pin,
                             GError** error) {
  return Guarded("UnlockSIM", error, [&]() -> gboolean {
    USBModem* modem = Preamble(obj, devid, {pin}, error);
    if (!modem) return FALSE;
    int ret = IsSafeText(pin) ? modem->PINUnlock(pin) : -1;
    if (ret < 0) {
      USBMODEM_FAIL(error, "error", -ret, "Failed to unlock PIN [%s]", devid);
      return FALSE;
    }
    return TRUE;
  });
}

gboolean usbmodem_set_pin(USBModemObject* obj, const char* devid, const char* oldpin,
                          const char* newpin, gboolean protection, GError** error) {
  return Guarded("SetPIN", error, [&]() -> gboolean {
    USBModem* modem = Preamble(obj, devid, {oldpin, newpin}, error);
    if (!modem) return FALSE;
    int ret = IsSafeText(oldpin) && IsSafeText(newpin)
                  ? modem->PINSet(oldpin, newpin, protection ? true : false)
                  : -1;
    if (ret < 0) {
      USBMODEM_FAIL(error, "error", -ret, "Failed to set PIN [%s]", devid);
      return FALSE;
    }
    return TRUE;
  });
}

gboolean usbmodem_get_profile(USBModemObject* obj, const char* devid, char** profile,
                              GError** error) {
  return Guarded("GetProfile", error, [&]() -> gboolean {
    USBModem* modem = Preamble(obj, devid, {}, error);
    if (!modem) return FALSE;
    if (!profile) {
      USBMODEM_FAIL(error, "badparameter", 1, "Bad parameter");
      return FALSE;
    }
    bool flag = false;
    Json::Value value = modem->GetProfile(flag);
    if (flag) {
      USBMODEM_FAIL(error, "error", -1, "USBModem error detected when get profile");
      return FALSE;
    }
    *profile = g_strdup(value.toStyledString().c_str());
    return TRUE;
  });
}

gboolean usbmodem_set_profile(USBModemObject* obj, const char* devid, const char* profile,
                              GError** error) {
  return Guarded("SetProfile", error, [&]() -> gboolean {
    USBModem* modem = Preamble(obj, devid, {profile}, error);
    if (!modem) return FALSE;
    // A JSON text whose content could not be stored or dialled is refused before the link is
    // touched; text that is no JSON at all fails after the link went down.
    {
      Json::Value probe;
      Json::Reader probeReader;
      if (probeReader.parse(std::string(profile), probe, true) && !IsAcceptableProfile(probe)) {
        USBMODEM_FAIL(error, "error", -1, "Failed to set profile");
        return FALSE;
      }
    }
    bool flag = false;
    bool disconnected = modem->IsNetDisconnected(flag);
    if (flag) {
      USBMODEM_FAIL(error, "error", -1, "Error on checking net status [%s]", devid);
      return FALSE;
    }
    if (!disconnected && modem->NetDisconnect() < 0) {
      USBMODEM_FAIL(error, "error", -1, "Failed to disconnect [%s]", devid);
      return FALSE;
    }
    Json::Value value;
    Json::Reader reader;
    if (!reader.parse(std::string(profile), value, true)) {
      USBMODEM_FAIL(error, "error", -1, "Failed to read profile string");
      return FALSE;
    }
    if (modem->SetProfile(value) != 0) {
      USBMODEM_FAIL(error, "error", -1, "Failed to set profile");
      return FALSE;
    }
    if (!disconnected) {
      sleep(3);
      int ret = modem->NetConnect(1);
      if (ret < 0) {
        USBMODEM_FAIL(error, "error", -ret, "Failed to Connect [%s]", devid);
        return FALSE;
      }
    }
    return TRUE;
  });
}

gboolean usbmodem_unlock_pin(USBModemObject* obj, const char* devid, const char* puk,
                             const char* pin, GError** error) {
  return Guarded("UnlockPIN", error, [&]() -> gboolean {
    USBModem* modem = Preamble(obj, devid, {puk, pin}, error);
    if (!modem) return FALSE;
    int ret = IsSafeText(puk) && IsSafeText(pin) ? modem->PUKSet(puk, pin) : -1;
    if (ret < 0) {
      USBMODEM_FAIL(error, "error", -ret, "Failed to unlock PIN [%s]", devid);
      return FALSE;
    }
    return TRUE;
  });
}

gboolean usbmodem_get_usbmodem_if_list(USBModemObject* obj, char** usbmodem_if_list,
                                       GError** error) {
  return Guarded("GetUSBModemIfList", error, [&]() -> gboolean {
    if (!obj || !usbmodem_if_list) {
      USBMODEM_FAIL(error, "badparameter", 1, "Bad parameter");
      return FALSE;
    }
    std::string text;
    for (USBModem& modem : obj->list) {
      if (modem.IsNull() || !modem.IsInited()) continue;
      bool flag = false;
      text += modem.GetNetIFName(flag) + "\n";
    }
    *usbmodem_if_list = g_strdup(text.c_str());
    return TRUE;
  });
}

gboolean usbmodem_get_devid_by_ifname(USBModemObject* obj, const char* ifname, char** devid,
                                      GError** error) {
  return Guarded("GetDevIdByIfName", error, [&]() -> gboolean {
    if (!obj || !ifname || !devid) {
      USBMODEM_FAIL(error, "badparameter", 1, "Bad parameter");
      return FALSE;
    }
    std::string found;
    // An empty name names no interface (a modem that is not connected reports an empty one).
    for (USBModem& modem : obj->list) {
      if (!*ifname) break;
      if (modem.IsNull() || !modem.IsInited()) continue;
      bool flag = false;
      if (modem.GetNetIFName(flag) == ifname) {
        found = modem.GetDevId();
        break;
      }
    }
    *devid = g_strdup(found.c_str());
    return TRUE;
  });
}

gboolean usbmodem_polling_tick(gpointer data) {
  USBModemObject* obj = static_cast<USBModemObject*>(data);
  if (!obj) return TRUE;
  try {
    obj->list.Update();
    for (USBModem& modem : obj->list) modem.NetTryAutoConnect();
  } catch (std::exception const& e) {
    VORN_LOG(LOG_ERR, "Exception in polling tick: %s", e.what());
  } catch (...) {
    VORN_LOG(LOG_ERR, "Exception in polling tick");
  }
  return TRUE;
}

namespace {

const vornnetsdk::dbus::DBusMethodEntry kUsbmodemMethods[] = {
    VORN_DBUS_METHOD("Connect", usbmodem_connect),
    VORN_DBUS_METHOD("Disconnect", usbmodem_disconnect),
    VORN_DBUS_METHOD("GetUSBModemList", usbmodem_get_usbmodem_list),
    VORN_DBUS_METHOD("GetUSBModem", usbmodem_get_usbmodem),
    VORN_DBUS_METHOD("GetSimInfo", usbmodem_get_sim_info),
    VORN_DBUS_METHOD("UnlockSIM", usbmodem_unlock_sim),
    VORN_DBUS_METHOD("SetPIN", usbmodem_set_pin),
    VORN_DBUS_METHOD("GetProfile", usbmodem_get_profile),
    VORN_DBUS_METHOD("SetProfile", usbmodem_set_profile),
    VORN_DBUS_METHOD("UnlockPIN", usbmodem_unlock_pin),
    VORN_DBUS_METHOD("GetUSBModemIfList", usbmodem_get_usbmodem_if_list),
    VORN_DBUS_METHOD("GetDevIdByIfName", usbmodem_get_devid_by_ifname),
};

const vornnetsdk::dbus::DBusGObjectInfo kUsbmodemObjectInfo = {
    "com.vornlink.usbmodem", kUsbmodemIntrospectionXml, kUsbmodemMethods,
    G_N_ELEMENTS(kUsbmodemMethods)};

}  // namespace

const vornnetsdk::dbus::DBusGObjectInfo* usbmodem_object_info() { return &kUsbmodemObjectInfo; }

USBModemServer::USBModemServer()
    : DBusServer("com.vornlink.usbmodem", "/", vornnetsdk::dbus::DBUS_BUS_SESSION),
      _object(static_cast<USBModemObject*>(g_object_new(usbmodem_object_get_type(), nullptr))) {}

USBModemServer::~USBModemServer() {
  if (_object) g_object_unref(_object);
}

bool USBModemServer::Initialize() {
  return DBusServer::Initialize(usbmodem_object_get_type(), &kUsbmodemObjectInfo, _object);
}

USBModemList* USBModemServer::GetList() { return &_object->list; }

guint USBModemServer::StartPollingTimer() {
  return g_timeout_add(10000, usbmodem_polling_tick, _object);
}

}  // namespace dbus
}  // namespace vornwireless
