// The AT dialect of a modem: which command asks a thing and how its reply is read. The base class
// speaks the standard 3GPP dialect; one subclass per USB vendor overrides what that vendor does
// differently. A dialect has no state.
//
// Every reply handed to a ParseRetString... function is the text of the device node handler's
// filter: echo and blank lines removed, each line ended by a line feed ("+CPIN: READY\nOK\n").
// Parsers never throw; on failure they log one LOG_ERR line, return -1 and leave their output as
// it was.
#ifndef VORNWIRELESS_USBMODEM_LIB_USBMODEM_ATIF_H
#define VORNWIRELESS_USBMODEM_LIB_USBMODEM_ATIF_H

#include <json/json.h>

#include <map>
#include <string>

namespace vornwireless {
namespace usbmodem_lib {

// SIM status as ParseRetStringQuarySIMStatus reports it. SIM_MUTE is never parsed: the SIM
// handler sets it for an empty reply.
enum SIM_STATUS {
  SIM_READY = 0,
  SIM_PIN = 1,
  SIM_PUK = 2,
  SIM_MUTE = 3,
  SIM_BUSY = 4,
  SIM_ERROR = 5,
  SIM_FAILURE = 6,
  SIM_UNKNOWN = 7,
};

// True when `value` may be pasted into an AT command line: every character is printable ASCII
// (0x20 to 0x7E) and none is a double quote or a semicolon. A carriage return or line feed would
// end the command and start a second one, a double quote would close the quoted argument early
// and a semicolon chains a further command onto the same line. An empty value is safe (callers
// that need a non-empty one test that themselves).
//
// The command builders paste their arguments in as they stand, so every PIN, PUK, APN and dial
// number that comes from outside is checked with this function before a command is built from it.
bool IsSafeATArgument(std::string const& value);

class USBModem_ATIF {
 public:
  // Virtual slots in this order; the destructor is the last one.
  virtual std::string GetATCommandQuarySIMStatus();                                         // AT+CPIN?
  virtual std::string GetATCommandSetSIMPIN(std::string const& pin);                        // AT+CPIN=<pin>
  virtual std::string GetATCommandSetSIMPUK(std::string const& puk, std::string const& pin);
  virtual std::string GetATCommandChangePINCode(std::string const& oldPin, std::string const& newPin);
  virtual std::string GetATCommandChangePINEnable(std::string const& mode, std::string const& pin);
  virtual std::string GetATCommandGetPINEnable();
  virtual std::string GetATCommandGetRSSI();
  virtual std::string GetATCommandGetHardwareFuncLvl();
  virtual std::string GetATCommandSetHardwareFuncLvl(std::string const& level);
  virtual std::string GetATCommandGetVendorName();
  virtual std::string GetATCommandGetProductName();
  virtual std::string GetATCommandGetIMSI();
  virtual std::string GetATCommandGetRoaming();
  virtual std::string GetATCommandGetDefaultISP();
  virtual std::string GetATCommandGetDefaultAPN();
  virtual std::string GetATCommandPINAttempt();
  virtual std::string GetATCommandPUKAttempt();
  virtual std::string GetATCommandGetUnsolicitedReports();  // empty: not supported
  virtual std::string GetATCommandSetUnsolicitedReports(bool enable);
  virtual std::string GetATCommandSetAPN(std::string const& cid, std::string const& apn);

  // SIM_STATUS value of a status reply (SIM_READY ... SIM_UNKNOWN, never SIM_MUTE).
  virtual int ParseRetStringQuarySIMStatus(std::string const& reply);
  // Signal level in percent (0 to 100).
  virtual int ParseRetStringGetSignalLevel(std::string const& reply, int& level);
  // "true" or "false".
  virtual int ParseRetStringGetRoaming(std::string const& reply, std::string& roaming);
  // The attempt count as text, possibly with a leading blank (callers use atoi).
  virtual int ParseRetStringPINRemainAttempt(std::string const& reply, std::string& remain);
  virtual int ParseRetStringPUKRemainAttempt(std::string const& reply, std::string& remain);
  virtual int ParseRetStringDefaultISP(std::string const& reply, std::string& isp);
  virtual int ParseRetStringDefaultAPN(std::string const& reply, std::string& apn);
  // An array of objects {"number": "*99***<cid>#", "apn": "<apn>"}.
  virtual int ParseRetStringDefaultAPNList(std::string const& reply, Json::Value& list);
  // The value of a one-line answer: after the first colon when there is one, up to the line feed.
  virtual int ParseRetStringDefaultFormat(std::string const& reply, std::string& out);
  // 0 when the reply holds "OK" and no "ERROR", else -1.
  virtual int ParseRetStringIsOK(std::string const& reply);
  virtual ~USBModem_ATIF();

  // The dialect of a USB vendor id ("12d1", ...); an unknown vendor gets the base dialect.
  // Never null; give the result back with DeleteATIF.
  static USBModem_ATIF* CreateATIF(std::string const& vendor);
  static void DeleteATIF(USBModem_ATIF* atif);  // null is accepted
  static void CreateVendorHash();

  typedef USBModem_ATIF* (*Factory)();
  static std::map<std::string, Factory> vendorTable;

  // The shared field parser: skips through the first colon of `reply`, then reads `fieldNumber`
  // fields ended by `delimiter` (or by the end of the reply); the last one read is `out`, leading
  // blanks kept. The last field of a line is not ended by the delimiter and so runs on over the
  // line feed into the rest of the reply. 0, or -1 (n below 1, empty reply, "ERROR" in the reply,
  // no colon, or fewer fields than asked for).
  static int GetLineWithDelim(std::string const& reply, char delimiter, int fieldNumber,
                              std::string& out);
};

}  // namespace usbmodem_lib
}  // namespace vornwireless

#endif
