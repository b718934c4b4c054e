#include "vornwireless/usbmodem_lib/usbmodem_atif_pantech.h"

namespace vornwireless {
namespace usbmodem_lib {

USBModem_ATIF* CreateATIFPantech() { return new USBModem_ATIF_Pantech(); }

std::string USBModem_ATIF_Pantech::GetATCommandPINAttempt() { return "AT_OERCN"; }
std::string USBModem_ATIF_Pantech::GetATCommandPUKAttempt() { return "AT_OERCN"; }

// _OERCN: <pin_times>,<puk_times>
int USBModem_ATIF_Pantech::ParseRetStringPINRemainAttempt(std::string const& reply,
                                                          std::string& remain) {
  return GetLineWithDelim(reply, ',', 1, remain);
}

int USBModem_ATIF_Pantech::ParseRetStringPUKRemainAttempt(std::string const& reply,
                                                          std::string& remain) {
  return GetLineWithDelim(reply, ',', 2, remain);
}

}  // namespace usbmodem_lib
}  // namespace vornwireless
