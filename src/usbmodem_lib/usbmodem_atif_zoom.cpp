#include "vornwireless/usbmodem_lib/usbmodem_atif_zoom.h"

#include <climits>
#include <cstdlib>

#include "vornplatform/log.h"

namespace vornwireless {
namespace usbmodem_lib {

USBModem_ATIF* CreateATIFZoom() { return new USBModem_ATIF_Zoom(); }

std::string USBModem_ATIF_Zoom::GetATCommandSetSIMPIN(std::string const& pin) {
  return "AT+CPIN=\"" + pin + "\"";
}

std::string USBModem_ATIF_Zoom::GetATCommandSetSIMPUK(std::string const& puk,
                                                      std::string const& pin) {
  return "AT+CPIN=\"" + puk + "\",\"" + pin + "\"";
}

std::string USBModem_ATIF_Zoom::GetATCommandGetRSSI() { return "AT+CIND?"; }
std::string USBModem_ATIF_Zoom::GetATCommandPINAttempt() { return "AT*EPINR=1"; }
std::string USBModem_ATIF_Zoom::GetATCommandPUKAttempt() { return "AT*EPINR=3"; }

// +CIND: <battery>,<signal 0..5>,...
int USBModem_ATIF_Zoom::ParseRetStringGetSignalLevel(std::string const& reply, int& level) {
  std::string field;
  if (GetLineWithDelim(reply, ',', 2, field) != 0) return -1;
  const int value = atoi(field.c_str());
  // A value whose level would not fit an int is no signal reading.
  if (value > INT_MAX / 20 || value < INT_MIN / 20) {
    VORN_LOG(LOG_ERR, "invalid signal value %d in input string: (%s)", value, reply.c_str());
    return -1;
  }
  level = value * 20;
  return 0;
}

// *EPINR: <attempts>
int USBModem_ATIF_Zoom::ParseRetStringPINRemainAttempt(std::string const& reply,
                                                       std::string& remain) {
  return ParseRetStringDefaultFormat(reply, remain);
}

int USBModem_ATIF_Zoom::ParseRetStringPUKRemainAttempt(std::string const& reply,
                                                       std::string& remain) {
  return ParseRetStringDefaultFormat(reply, remain);
}

}  // namespace usbmodem_lib
}  // namespace vornwireless
