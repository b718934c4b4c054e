#include "vornwireless/usbmodem_lib/usbmodem_atif_huawei.h"

namespace vornwireless {
namespace usbmodem_lib {

USBModem_ATIF* CreateATIFHuawei() { return new USBModem_ATIF_Huawei(); }

std::string USBModem_ATIF_Huawei::GetATCommandPINAttempt() { return "AT^CPIN?"; }
std::string USBModem_ATIF_Huawei::GetATCommandPUKAttempt() { return "AT^CPIN?"; }
std::string USBModem_ATIF_Huawei::GetATCommandGetUnsolicitedReports() { return "AT^CURC?"; }

std::string USBModem_ATIF_Huawei::GetATCommandSetUnsolicitedReports(bool enable) {
  return enable ? "AT^CURC=1" : "AT^CURC=0";
}

// ^CPIN: <code>,[<times>],<puk_times>,<pin_times>,<puk2_times>,<pin2_times>
int USBModem_ATIF_Huawei::ParseRetStringPINRemainAttempt(std::string const& reply,
                                                         std::string& remain) {
  return GetLineWithDelim(reply, ',', 4, remain);
}

int USBModem_ATIF_Huawei::ParseRetStringPUKRemainAttempt(std::string const& reply,
                                                         std::string& remain) {
  return GetLineWithDelim(reply, ',', 3, remain);
}

}  // namespace usbmodem_lib
}  // namespace vornwireless
