#include "vornwireless/usbmodem_lib/usbmodem_atif_dlink.h"

namespace vornwireless {
namespace usbmodem_lib {

USBModem_ATIF* CreateATIFDLink() { return new USBModem_ATIF_DLink(); }

std::string USBModem_ATIF_DLink::GetATCommandSetSIMPIN(std::string const& pin) {
  return "AT+CPIN=\"" + pin + "\"";
}

std::string USBModem_ATIF_DLink::GetATCommandSetSIMPUK(std::string const& puk,
                                                       std::string const& pin) {
  return "AT+CPIN=\"" + puk + "\",\"" + pin + "\"";
}

std::string USBModem_ATIF_DLink::GetATCommandPINAttempt() { return "AT+EPINC?"; }
std::string USBModem_ATIF_DLink::GetATCommandPUKAttempt() { return "AT+EPINC?"; }

// +EPINC: <pin1>,<pin2>,<puk1>,<puk2>
int USBModem_ATIF_DLink::ParseRetStringPINRemainAttempt(std::string const& reply,
                                                        std::string& remain) {
  return GetLineWithDelim(reply, ',', 1, remain);
}

int USBModem_ATIF_DLink::ParseRetStringPUKRemainAttempt(std::string const& reply,
                                                        std::string& remain) {
  return GetLineWithDelim(reply, ',', 3, remain);
}

}  // namespace usbmodem_lib
}  // namespace vornwireless
