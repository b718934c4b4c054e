// The registry of plugged modems, filled from the information files /tmp/usbmodem.info<N>.
#ifndef VORNWIRELESS_USBMODEM_LIB_USBMODEM_LIST_H
#define VORNWIRELESS_USBMODEM_LIB_USBMODEM_LIST_H

#include <string>
#include <vector>

#include "vornwireless/usbmodem_lib/usbmodem.h"

namespace vornwireless {
namespace usbmodem_lib {

class USBModemList : public std::vector<USBModem> {
 public:
  USBModemList();
  virtual ~USBModemList();

  // First modem with this id / device id, else nullObject.
  USBModem& FindUSBModem(int ifid);
  USBModem& FindUSBModem(std::string const& devid);

  // Adds a modem for every new information file. 0, -1.
  int SearchInfoPath();
  // SearchInfoPath, removal of the modems whose file is gone, initialisation of the others. 0, -1.
  int Update();

  static USBModemNull nullObject;
};

}  // namespace usbmodem_lib
}  // namespace vornwireless

#endif
