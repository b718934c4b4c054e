// AT dialect of USB vendor 230d: quoted PIN and PUK, signal from AT+CIND?, attempts through AT*EPINR.
#ifndef VORNWIRELESS_USBMODEM_LIB_USBMODEM_ATIF_ZOOM_H
#define VORNWIRELESS_USBMODEM_LIB_USBMODEM_ATIF_ZOOM_H

#include "vornwireless/usbmodem_lib/usbmodem_atif.h"

namespace vornwireless {
namespace usbmodem_lib {

class USBModem_ATIF_Zoom : public USBModem_ATIF {
 public:
  std::string GetATCommandSetSIMPIN(std::string const& pin) override;  // AT+CPIN="<pin>"
  std::string GetATCommandSetSIMPUK(std::string const& puk, std::string const& pin) override;
  std::string GetATCommandGetRSSI() override;      // AT+CIND?
  std::string GetATCommandPINAttempt() override;   // AT*EPINR=1
  std::string GetATCommandPUKAttempt() override;   // AT*EPINR=3
  int ParseRetStringGetSignalLevel(std::string const& reply, int& level) override;
  int ParseRetStringPINRemainAttempt(std::string const& reply, std::string& remain) override;
  int ParseRetStringPUKRemainAttempt(std::string const& reply, std::string& remain) override;
};

// The factory registered under its USB vendor id in USBModem_ATIF::vendorTable.
USBModem_ATIF* CreateATIFZoom();

}  // namespace usbmodem_lib
}  // namespace vornwireless

#endif
