// The com.vornlink.usbmodem service: the modem registry on D-Bus, object "/", session bus.
#ifndef VORNWIRELESS_DBUS_USBMODEM_USBMODEM_SERVER_H
#define VORNWIRELESS_DBUS_USBMODEM_USBMODEM_SERVER_H

#include <glib-object.h>

#include "vornplatform/dbus.h"
#include "vornwireless/usbmodem_lib/usbmodem_list.h"

extern const char kUsbmodemIntrospectionXml[];

namespace vornwireless {
namespace dbus {

// The exported GObject ("USBModemObject"): the registry after the GObject header.
struct USBModemObject {
  GObject parent;
  vornwireless::usbmodem_lib::USBModemList list;
};
struct USBModemObjectClass {
  GObjectClass parent;
};

GType usbmodem_object_get_type();

// The handlers, in table order. In strings may be NULL when called directly (bad parameter).
gboolean usbmodem_connect(USBModemObject* obj, const char* devid, GError** error);
gboolean usbmodem_disconnect(USBModemObject* obj, const char* devid, GError** error);
gboolean usbmodem_get_usbmodem_list(USBModemObject* obj, char** usbmodem_list, GError** error);
gboolean usbmodem_get_usbmodem(USBModemObject* obj, const char* devid, char** usbmodem,
                               GError** error);
gboolean usbmodem_get_sim_info(USBModemObject* obj, const char* devid, char** usbmodem,
                               GError** error);
gboolean usbmodem_unlock_sim(USBModemObject* obj, const char* devid, const char* pin,
                             GError** error);
gboolean usbmodem_set_pin(USBModemObject* obj, const char* devid, const char* oldpin,
                          const char* newpin, gboolean protection, GError** error);
gboolean usbmodem_get_profile(USBModemObject* obj, const char* devid, char** profile,
                              GError** error);
gboolean usbmodem_set_profile(USBModemObject* obj, const char* devid, const char* profile,
                              GError** error);
gboolean usbmodem_unlock_pin(USBModemObject* obj, const char* devid, const char* puk,
                             const char* pin, GError** error);
gboolean usbmodem_get_usbmodem_if_list(USBModemObject* obj, char** usbmodem_if_list,
                                       GError** error);
gboolean usbmodem_get_devid_by_ifname(USBModemObject* obj, const char* ifname, char** devid,
                                      GError** error);

// The polling tick: Update, then NetTryAutoConnect for every modem. Always TRUE.
gboolean usbmodem_polling_tick(gpointer obj);

// The method table of the service.
const vornnetsdk::dbus::DBusGObjectInfo* usbmodem_object_info();

class USBModemServer : public vornnetsdk::dbus::DBusServer {
 public:
  USBModemServer();
  ~USBModemServer() override;

  // Registers the object on the bus. true on success.
  bool Initialize();
  vornwireless::usbmodem_lib::USBModemList* GetList();
  // Every 10 seconds: the polling tick. The source id.
  guint StartPollingTimer();

 private:
  USBModemObject* _object;
};

}  // namespace dbus
}  // namespace vornwireless

#endif
