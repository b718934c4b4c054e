// AT dialect of USB vendor 12d1: attempts through AT^CPIN?, unsolicited reports through AT^CURC.
#ifndef VORNWIRELESS_USBMODEM_LIB_USBMODEM_ATIF_HUAWEI_H
#define VORNWIRELESS_USBMODEM_LIB_USBMODEM_ATIF_HUAWEI_H

#include "vornwireless/usbmodem_lib/usbmodem_atif.h"

namespace vornwireless {
namespace usbmodem_lib {

class USBModem_ATIF_Huawei : public USBModem_ATIF {
 public:
  std::string GetATCommandPINAttempt() override;                  // AT^CPIN?
  std::string GetATCommandPUKAttempt() override;                  // AT^CPIN?
  std::string GetATCommandGetUnsolicitedReports() override;       // AT^CURC?
  std::string GetATCommandSetUnsolicitedReports(bool enable) override;  // AT^CURC=1 / AT^CURC=0
  int ParseRetStringPINRemainAttempt(std::string const& reply, std::string& remain) override;
  int ParseRetStringPUKRemainAttempt(std::string const& reply, std::string& remain) override;
};

// The factory registered under its USB vendor id in USBModem_ATIF::vendorTable.
USBModem_ATIF* CreateATIFHuawei();

}  // namespace usbmodem_lib
}  // namespace vornwireless

#endif
