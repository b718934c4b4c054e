// One plugged 3G/LTE dongle: identity, initialisation state, link state of its dialler, and the
// forwarders to its SIM handler. The registry of these objects is USBModemList.
#ifndef VORNWIRELESS_USBMODEM_LIB_USBMODEM_H
#define VORNWIRELESS_USBMODEM_LIB_USBMODEM_H

#include <json/json.h>

#include <string>

#include "vornwireless/usbmodem_lib/usbmodem_simhandler.h"

namespace vornwireless {
namespace usbmodem_lib {

class USBModem {
 public:
  // _infoState values.
  enum { INFO_NOT_INITED = 0, INFO_INITED = 1, INFO_FAILED = 2 };
  // _netStatus values.
  enum {
    NET_CONNECTED = 0,        // interface has name and address
    NET_CONNECTING_LOST = 1,  // was up or near up; address missing now
    NET_CONNECTING = 2,       // dialler runs, interface not yet known
    NET_DISCONNECTED = 3,     // no dialler, no failed dial
    NET_CONNECTION_LOST = 4   // no dialler after failed dials
  };

  USBModem(unsigned int ifid, std::string const& infoPath);
  // Member-wise, except that the dialler's pid file, interface name, address and mask start
  // empty in the copy (operator= takes them over).
  USBModem(USBModem const& other);
  USBModem& operator=(USBModem const& other);
  // Relocation inside the registry's vector moves a modem whole, its dial state included.
  USBModem(USBModem&& other) noexcept;
  USBModem& operator=(USBModem&& other) noexcept;

  virtual ~USBModem();
  // "usbmodem" followed by the decimal id.
  virtual std::string GetDevId() const;
  virtual bool IsNull() const;
  virtual bool IsInited() const;
  virtual bool IsInfoExist() const;

  int InitInfo();
  unsigned GetIfid() const;
  bool IsError();
  void IncreaseErrorCounter();
  bool IsNewPlugIn();

  // Forwarders to the SIM handler.
  std::string GetPINStatus(bool& error);
  int PINUnlock(std::string const& pin);
  int PINSet(std::string const& oldPin, std::string const& newPin, bool protection);
  int PINGetEnableProtection();
  int PUKSet(std::string const& puk, std::string const& pin);
  Json::Value GetProfile(bool& error);
  Json::Value GetSimInfo(bool& error);
  int SetProfile(Json::Value const& value);

  // The SIM handler's data, then "id", "ifname", "ip", "mask", "net_status".
  Json::Value GetUSBModemData(bool& error);

  // Dial-up.
  int NetConnect(unsigned int attempts);  // 1 dialler started, -1 failure
  int NetDisconnect();                    // 0, -1
  int NetTryAutoConnect();                // 1 dialled, 0 dial failed, -1 nothing done / error
  int GetLinkStats();                     // recomputes _netStatus; 0
  int UpdateNetStatus();                  // 1 nothing further, 2 log examined, -1 failure
  int AssignConnectInfo();                // 1 interface found, 2 not yet, -1 give the dial up
  std::string GetNetStatus(bool& error);
  bool IsNetDisconnected(bool& error);
  std::string GetNetIFName(bool& error);
  std::string GetNetLocalIP(bool& error);
  std::string GetNetLocalMask(bool& error);
  bool IsWvdialUp() const;
  int UpdateIP();
  int SetDefaultRoute(std::string const& value);
  void InsertPPPModules();
  int BackgroundExec(std::string const& path, std::string const& init, std::string const& baud,
                     std::string const& phone, std::string const& modem, std::string const& user,
                     std::string const& password, std::string const& pidFile,
                     std::string const& logFile);
  // Occurrences of key in text, overlapping ones included.
  static int KeyCountInText(std::string const& text, std::string const& key);

  // The reload of firewall and traffic-control rules, in a detached child. 0, -1 fork failed.
  static int ReloadFirewall();

  // Read-only views for diagnostics and tests.
  int GetInfoState() const { return _infoState; }
  int GetNetStatusValue() const { return _netStatus; }
  int GetDialFailCount() const { return _dialFailCount; }
  unsigned int GetDialAttempts() const { return _dialAttempts; }
  int GetErrorCount() const { return _errorCount; }
  std::string const& GetInfoPath() const { return _infoPath; }
  std::string const& GetPidFile() const { return _pidFile; }
  USBModem_SIMHandler& GetSIMHandler() { return _simHandler; }

 protected:
  unsigned int _ifid;
  int _infoState;
  int _netStatus;
  std::string _infoPath;
  std::string _pidFile;
  int _dialFailCount;
  unsigned int _dialAttempts;
  std::string _ifName;
  std::string _localIP;
  std::string _localMask;
  bool _busy;
  bool _newPlugIn;
  int _errorCount;
  USBModem_SIMHandler _simHandler;

 private:
  int NetConnectSteps(unsigned int attempts);
  std::string WvdialLogPath(bool& error);
};

// The object every failed lookup returns.
class USBModemNull : public USBModem {
 public:
  USBModemNull();
  ~USBModemNull() override;
  std::string GetDevId() const override;
  bool IsNull() const override;
  bool IsInited() const override;
  bool IsInfoExist() const override;
};

}  // namespace usbmodem_lib
}  // namespace vornwireless

#endif
