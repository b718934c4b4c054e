// AT dialect of USB vendor 2001: PIN and PUK are given in double quotes.
#ifndef VORNWIRELESS_USBMODEM_LIB_USBMODEM_ATIF_DLINK_H
#define VORNWIRELESS_USBMODEM_LIB_USBMODEM_ATIF_DLINK_H

#include "vornwireless/usbmodem_lib/usbmodem_atif.h"

namespace vornwireless {
namespace usbmodem_lib {

class USBModem_ATIF_DLink : public USBModem_ATIF {
 public:
  std::string GetATCommandSetSIMPIN(std::string const& pin) override;  // AT+CPIN="<pin>"
  std::string GetATCommandSetSIMPUK(std::string const& puk, std::string const& pin) override;
  std::string GetATCommandPINAttempt() override;  // AT+EPINC?
  std::string GetATCommandPUKAttempt() override;  // AT+EPINC?
  int ParseRetStringPINRemainAttempt(std::string const& reply, std::string& remain) override;
  int ParseRetStringPUKRemainAttempt(std::string const& reply, std::string& remain) override;
};

// The factory registered under its USB vendor id in USBModem_ATIF::vendorTable.
USBModem_ATIF* CreateATIFDLink();

}  // namespace usbmodem_lib
}  // namespace vornwireless

#endif
