// AT dialect of USB vendor 106c: attempts through AT_OERCN.
#ifndef VORNWIRELESS_USBMODEM_LIB_USBMODEM_ATIF_PANTECH_H
#define VORNWIRELESS_USBMODEM_LIB_USBMODEM_ATIF_PANTECH_H

#include "vornwireless/usbmodem_lib/usbmodem_atif.h"

namespace vornwireless {
namespace usbmodem_lib {

class USBModem_ATIF_Pantech : public USBModem_ATIF {
 public:
  std::string GetATCommandPINAttempt() override;  // AT_OERCN
  std::string GetATCommandPUKAttempt() override;  // AT_OERCN
  int ParseRetStringPINRemainAttempt(std::string const& reply, std::string& remain) override;
  int ParseRetStringPUKRemainAttempt(std::string const& reply, std::string& remain) override;
};

// The factory registered under its USB vendor id in USBModem_ATIF::vendorTable.
USBModem_ATIF* CreateATIFPantech();

}  // namespace usbmodem_lib
}  // namespace vornwireless

#endif
