// The modem's knowledge of its SIM: cached status and identity, PIN and PUK operations, the
// sequence that makes a SIM usable once unlocked, and the per-SIM dial profile.
//
// Ownership of the sub-handlers: `_atif` and `_nodeHandler` are shared owners
// (std::shared_ptr; the dialect is released through USBModem_ATIF::DeleteATIF). A USBModem is
// kept by value in a vector, so its SIM handler is copied on every relocation and assigned over
// on every erase. Copies share the dialect and the node handler, as a member-wise copy does; the
// last copy to go deletes them, and an assignment drops the overwritten ones. So a relocated or
// erased-over modem never holds deleted sub-handlers, and nothing leaks. `UnsetSubHandler()`
// drops this copy's share only and nulls both members; the objects are deleted once no copy
// refers to them any more.
//
// Text that reaches the modem (PIN, PUK, APN, dial number) is refused with -1 before any command
// is sent when it holds a carriage return, a line feed, a double quote, a semicolon or another
// non-printable character (IsSafeATArgument of the AT dialect).
#ifndef VORNWIRELESS_USBMODEM_LIB_USBMODEM_SIMHANDLER_H
#define VORNWIRELESS_USBMODEM_LIB_USBMODEM_SIMHANDLER_H

#include <json/json.h>

#include <memory>
#include <string>

#include "vornwireless/usbmodem_lib/usbmodem_atif.h"

namespace vornwireless {
namespace usbmodem_lib {

class USBModem_ATIF;
class USBModem_DeviceNodeHandler;

class USBModem_SIMHandler {
 public:
  // _PINStatus holds a SIM_STATUS value of the dialect (SIM_READY ... SIM_UNKNOWN).

  // Where profiles live and what they hold.
  static const char* const kProfileDir;         // "/var/lib/usbmodem"
  static const char* const kProfilePrefix;      // "/var/lib/usbmodem/usbmodem.profile."
  static const char* const kProfileSection;     // "USBModem Profile"
  static const char* const kNetworkListPath;    // "/usr/share/usbmodem/wcdma_list.json"
  static const char* const kInfoPathFormat;     // "/tmp/usbmodem.info%d"

  USBModem_SIMHandler();
  USBModem_SIMHandler(USBModem_SIMHandler const&) = default;
  USBModem_SIMHandler& operator=(USBModem_SIMHandler const&) = default;
  virtual ~USBModem_SIMHandler();

  // ---- initialisation ----
  // 0: usable (ready, or waiting for its PIN/PUK, or a failed SIM listed as no_sim); -1 otherwise.
  int InitHandler(unsigned int const& ifid);
  // Creates the dialect from USB_VENDOR and the node handler; 0 or -1.
  int SetSubHandler(unsigned int const& ifid);
  // Drops this copy's share of both sub-handlers; both members become null.
  void UnsetSubHandler();
  // Radio on, unsolicited reports off, profile, caches; 0 or -1.
  int InitAfterUnlocked();
  int SetHardwareFuncLvl(std::string const& level);
  int SetUnsolicitedReports(bool enable);

  // ---- status ----
  // Asks the modem; sets _PINStatus (7 when the command could not be sent, 3 on an empty reply).
  void UpdateSIMStatus();
  // "ready", "pin_protect", "puk_protect", "mute" or "no_sim"; asks the modem every time.
  std::string GetPINStatus(bool& error);
  int GetPINStatusValue() const { return _PINStatus; }
  // 1 protected, 0 not, -1 unknown.
  int GetPINEnable();
  int PINGetEnableProtection() { return GetPINEnable(); }

  // ---- PIN and PUK: 0 success, -2 the SIM refused, -1 any other failure ----
  int PINUnlock(std::string const& pin);
  int PINSet(std::string const& oldPin, std::string const& newPin, bool protection);
  int PUKSet(std::string const& puk, std::string const& pin);
  int ChangePINWithPUK(std::string const& puk, std::string const& pin);
  int ChangePIN(std::string const& oldPin, std::string const& newPin);
  int ChangePINEnable(std::string const& pin, bool enable);
  // Remaining attempts, or -1.
  int PINGetAttemptRemain();
  int PUKGetAttemptRemain();

  // ---- reports ----
  Json::Value GetSimInfo(bool& error);
  Json::Value GetUSBModemData(bool& error);

  // ---- cached identity ----
  std::string GetIMSI(bool& error);
  std::string GetVendorName(bool& error);
  std::string GetProductName(bool& error);
  std::string GetRoaming(bool& error);
  std::string GetDefaultISP(bool& error);
  std::string GetDefaultAPN(bool& error);
  Json::Value GetDefaultAPNList(bool& error);
  int GetSignalQuality(bool& error);

  // ---- node handler forwarders ----
  int GetConnectNode(std::string& node);
  void ReleaseConnectNode();
  int ModemCmd(std::string const& cmd, std::string& reply);

  // ---- profile ----
  int InitProfile();
  int ResetProfile();
  Json::Value GetProfile(bool& error);
  int SetProfile(Json::Value const& value);
  std::string GetProfileWithKey(std::string const& key, bool& error);
  int SetProfileWithKey(std::string const& key, std::string const& value);
  int CheckAndWriteAPN(std::string const& number, std::string const& apn);
  std::string GetDefaultLocation(bool& error);
  bool ReadAPNData(Json::Value& value);
  std::string const& GetProfilePath() const { return _profilePath; }

  // Sub-handlers (null before SetSubHandler or after UnsetSubHandler).
  USBModem_ATIF* GetATIF() const { return _atif.get(); }
  USBModem_DeviceNodeHandler* GetNodeHandler() const { return _nodeHandler.get(); }

  // True when text may be pasted into an AT command (IsSafeATArgument): printable ASCII, no
  // double quote, no semicolon.
  static bool IsSafeModemText(std::string const& text);

 private:
  int SendModemCommand(std::string const& cmd, std::string& reply);
  void QueryCached(std::string const& cmd,
                   int (USBModem_ATIF::*parse)(std::string const&, std::string&), char const* what,
                   std::string& cache, bool& error);

  int _PINStatus;
  std::string _imsi;
  int _signal;
  std::string _vendorName;
  std::string _productName;
  std::string _roaming;
  std::string _defaultISP;
  std::string _defaultAPN;
  Json::Value _defaultAPNList;
  std::string _profilePath;
  std::shared_ptr<USBModem_ATIF> _atif;
  std::shared_ptr<USBModem_DeviceNodeHandler> _nodeHandler;
};

}  // namespace usbmodem_lib
}  // namespace vornwireless

#endif
