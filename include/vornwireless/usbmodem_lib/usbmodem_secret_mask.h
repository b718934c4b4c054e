// AT commands that carry a PIN, a PUK or a password are logged with those values masked.
#ifndef VORNWIRELESS_USBMODEM_LIB_USBMODEM_SECRET_MASK_H
#define VORNWIRELESS_USBMODEM_LIB_USBMODEM_SECRET_MASK_H

#include <string>

namespace vornwireless {
namespace usbmodem_lib {

// cmd as it may be logged. AT+CPIN= (and AT^CPIN=, AT$QCPIN=): every argument becomes "****"
// (quotes kept): AT+CPIN="1234" -> AT+CPIN="****". AT+CLCK= and AT+CPWD=: the facility and
// the mode stay, every quoted password becomes "****": AT+CLCK="SC",1,"****". Other commands are
// returned as they are.
std::string MaskSecretsInCommand(std::string const& cmd);

}  // namespace usbmodem_lib
}  // namespace vornwireless

#endif
