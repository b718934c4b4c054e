// SIM handler: cached status and identity, PIN and PUK operations, and the sequence that makes
// a SIM usable once it is unlocked. The profile functions live in usbmodem_simhandler_profile.cpp.
#include "vornwireless/usbmodem_lib/usbmodem_simhandler.h"

#include <unistd.h>

#include <cstdio>
#include <cstdlib>

#include "vornplatform/log.h"
#include "vornplatform/vlibc.h"
#include "vornwireless/usbmodem_lib/usbmodem_atif.h"
#include "vornwireless/usbmodem_lib/usbmodem_devicenodehandler.h"

namespace vornwireless {
namespace usbmodem_lib {

namespace {

const int kKeyBufferSize = 1024;
const int kWaitRounds = 10;

}  // namespace

const char* const USBModem_SIMHandler::kInfoPathFormat = "/tmp/usbmodem.info%d";

USBModem_SIMHandler::USBModem_SIMHandler()
    : _PINStatus(SIM_UNKNOWN),
      _signal(0),
      _defaultAPNList(Json::arrayValue) {}

USBModem_SIMHandler::~USBModem_SIMHandler() { UnsetSubHandler(); }

bool USBModem_SIMHandler::IsSafeModemText(std::string const& text) {
  return IsSafeATArgument(text);
}

void USBModem_SIMHandler::UnsetSubHandler() {
  // Each copy of the handler holds a share; the dialect and the node handler are deleted when
  // the last share goes (DeleteATIF for the dialect, delete for the node handler).
  _atif.reset();
  _nodeHandler.reset();
}

int USBModem_SIMHandler::SetSubHandler(unsigned int const& ifid) {
  UnsetSubHandler();
  char path[64];
  snprintf(path, sizeof(path), kInfoPathFormat, static_cast<int>(ifid));

  char vendor[kKeyBufferSize] = {0};
  if (VLIBCFileGetKeyValue(path, "USB_VENDOR", vendor, sizeof(vendor), 0) <= 0) {
    VORN_LOG(LOG_ERR, "Cannot parsing USB_VENDOR from %s", path);
    return -1;
  }
  _atif = std::shared_ptr<USBModem_ATIF>(USBModem_ATIF::CreateATIF(vendor),
                                         &USBModem_ATIF::DeleteATIF);
  _nodeHandler = std::make_shared<USBModem_DeviceNodeHandler>(ifid);
  if (!_atif || _nodeHandler->InitHandler(path, _atif->GetATCommandQuarySIMStatus()) != 0) {
    VORN_LOG(LOG_ERR, "failed on setup device node handler");
    return -1;
  }
  return 0;
}

int USBModem_SIMHandler::InitHandler(unsigned int const& ifid) {
  if (SetSubHandler(ifid) != 0) {
    VORN_LOG(LOG_ERR, "failed to setup sub handler in sim handler init");
    return -1;
  }
  UpdateSIMStatus();
  switch (_PINStatus) {
    case SIM_READY:
      if (InitAfterUnlocked() < 0) {
        VORN_LOG(LOG_ERR, "failed on sim init after pin locked");
        return -1;
      }
      return 0;
    case SIM_PIN:
    case SIM_PUK:
    case SIM_FAILURE:
      // Waits for its PIN or PUK; a failed SIM stays listed as no_sim.
      return 0;
    case SIM_MUTE:
      VORN_LOG(LOG_ERR, "Warning: sim mute before handler init");
      return -1;
    case SIM_BUSY:
    case SIM_ERROR:
      VORN_LOG(LOG_ERR, "Warning: sim error or busy detected when init");
      return -1;
    default:
      VORN_LOG(LOG_ERR, "Warning: unexpect sim result when init");
      return -1;
  }
}

int USBModem_SIMHandler::SendModemCommand(std::string const& cmd, std::string& reply) {
  if (!_nodeHandler) {
    reply.clear();
    return -1;
  }
  return _nodeHandler->SendCommand(cmd, reply);
}

void USBModem_SIMHandler::UpdateSIMStatus() {
  if (!_atif) {
    _PINStatus = SIM_UNKNOWN;
    return;
  }
  std::string reply;
  if (SendModemCommand(_atif->GetATCommandQuarySIMStatus(), reply) != 0) {
    _PINStatus = SIM_UNKNOWN;
  } else if (reply.empty()) {
    _PINStatus = SIM_MUTE;
  } else {
    _PINStatus = _atif->ParseRetStringQuarySIMStatus(reply);
  }
}

std::string USBModem_SIMHandler::GetPINStatus(bool& error) {
  UpdateSIMStatus();
  switch (_PINStatus) {
    case SIM_READY:
      return "ready";
    case SIM_PIN:
      return "pin_protect";
    case SIM_PUK:
      return "puk_protect";
    case SIM_MUTE:
      return "mute";
    case SIM_BUSY:
    case SIM_ERROR:
    case SIM_FAILURE:
      return "no_sim";
    default:
      VORN_LOG(LOG_ERR, "error value on _PINStatus, %d", _PINStatus);
      error = true;
      return "no_sim";
  }
}

int USBModem_SIMHandler::InitAfterUnlocked() {
  bool error = false;
  for (int round = 1; round <= kWaitRounds; ++round) {
    GetPINStatus(error);
    if (_PINStatus == SIM_READY) break;
    VORN_LOG(LOG_ERR, "Wait for sim ready after pin unlocked (%d)", round);
    sleep(1);
  }
  if (_PINStatus != SIM_READY || error) {
    VORN_LOG(LOG_ERR, "pin unlocked, but sim card is not ready, or has error status");
    return -1;
  }
  if (SetHardwareFuncLvl("1") != 0) {
    VORN_LOG(LOG_ERR, "failed on setting hardware function lvl");
    return -1;
  }
  if (SetUnsolicitedReports(false) < 0) {
    VORN_LOG(LOG_ERR, "failed on disabling Unsolicited Reports");
    return -1;
  }
  if (InitProfile() != 0) {
    VORN_LOG(LOG_ERR, "failed on init profile");
    return -1;
  }
  // Fills the caches; a modem that is slow to answer them is still usable.
  for (int round = 1; round <= kWaitRounds; ++round) {
    error = false;
    GetUSBModemData(error);
    if (!error) return 0;
    VORN_LOG(LOG_ERR, "Wait for get usbmodem data ready after pin unlocked (%d)", round);
    sleep(1);
  }
  return 0;
}

int USBModem_SIMHandler::SetHardwareFuncLvl(std::string const& level) {
  if (!_atif) return -1;
  std::string reply;
  if (SendModemCommand(_atif->GetATCommandGetHardwareFuncLvl(), reply) != 0 ||
      _atif->ParseRetStringIsOK(reply) != 0) {
    VORN_LOG(LOG_ERR, "Not support AT+CFUN?, skip setting hardware function lvl");
    return 0;
  }
  if (SendModemCommand(_atif->GetATCommandSetHardwareFuncLvl(level), reply) != 0) {
    VORN_LOG(LOG_ERR, "error on modem cmd: AT+CFUN=%s", level.c_str());
    return -1;
  }
  if (_atif->ParseRetStringIsOK(reply) != 0) {
    VORN_LOG(LOG_ERR, "error on setting hardware function lvl, ret: %s", reply.c_str());
    return -1;
  }
  return 0;
}

int USBModem_SIMHandler::SetUnsolicitedReports(bool enable) {
  if (!_atif) return -1;
  std::string reply;
  std::string current;
  if (SendModemCommand(_atif->GetATCommandGetUnsolicitedReports(), reply) != 0 ||
      _atif->ParseRetStringDefaultFormat(reply, current) != 0) {
    VORN_LOG(LOG_ERR, "skip unsolicited reports setting, not supported");
    return 0;
  }
  if (current.find(enable ? "1" : "0") != std::string::npos) return 0;
  if (SendModemCommand(_atif->GetATCommandSetUnsolicitedReports(enable), reply) != 0) {
    VORN_LOG(LOG_ERR, "error on modem cmd: change unsolicited reports setting");
    return -1;
  }
  if (_atif->ParseRetStringIsOK(reply) != 0) {
    VORN_LOG(LOG_ERR, "error on changing unsolicited reports setting, ret: %s", reply.c_str());
    return -1;
  }
  return 0;
}

int USBModem_SIMHandler::PINUnlock(std::string const& pin) {
  if (!IsSafeModemText(pin)) {
    VORN_LOG(LOG_ERR, "error on entering PIN: refused characters in the PIN");
    return -1;
  }
  if (!_atif) return -1;
  std::string reply;
  if (SendModemCommand(_atif->GetATCommandQuarySIMStatus(), reply) != 0) {
    VORN_LOG(LOG_ERR, "error on checking PIN stats, ret: %s", reply.c_str());
    return -1;
  }
  if (reply.find("+CPIN: READY") != std::string::npos) return 0;
  if (SendModemCommand(_atif->GetATCommandSetSIMPIN(pin), reply) != 0) {
    VORN_LOG(LOG_ERR, "error on entering PIN, ret: %s", reply.c_str());
    return -1;
  }
  if (_atif->ParseRetStringIsOK(reply) != 0) {
    VORN_LOG(LOG_ERR, "Cannot find OK in respond of PIN unlock, ret: %s", reply.c_str());
    return -2;
  }
  if (InitAfterUnlocked() < 0) {
    VORN_LOG(LOG_ERR, "failed on init after pin locked");
    return -1;
  }
  return 0;
}

int USBModem_SIMHandler::PUKSet(std::string const& puk, std::string const& pin) {
  return ChangePINWithPUK(puk, pin);
}

int USBModem_SIMHandler::ChangePINWithPUK(std::string const& puk, std::string const& pin) {
  if (!IsSafeModemText(puk) || !IsSafeModemText(pin)) {
    VORN_LOG(LOG_ERR, "error on modem cmd: change pin with puk: refused characters in the input");
    return -1;
  }
  // Wrong PINs move the SIM to PUK on its own: a stale cache is read again before refusing.
  if (_PINStatus != SIM_PUK) UpdateSIMStatus();
  if (_PINStatus != SIM_PUK) {
    VORN_LOG(LOG_ERR, "Cannot set PUK at this SIM stat");
    return -1;
  }
  std::string reply;
  if (SendModemCommand(_atif->GetATCommandSetSIMPUK(puk, pin), reply) != 0) {
    VORN_LOG(LOG_ERR, "error on modem cmd: change pin with puk");
    return -1;
  }
  if (_atif->ParseRetStringIsOK(reply) != 0) {
    VORN_LOG(LOG_ERR, "error on changing pin with puk, ret: %s", reply.c_str());
    return -2;
  }
  if (InitAfterUnlocked() < 0) {
    VORN_LOG(LOG_ERR, "failed on init after puk locked");
    return -1;
  }
  return 0;
}

int USBModem_SIMHandler::GetPINEnable() {
  if (!_atif) return -1;
  std::string reply;
  std::string const cmd = _atif->GetATCommandGetPINEnable();
  if (SendModemCommand(cmd, reply) != 0) {
    VORN_LOG(LOG_ERR, "error on modem cmd %s", cmd.c_str());
    return -1;
  }
  if (reply.find("+CLCK: 1") != std::string::npos) return 1;
  if (reply.find("+CLCK: 0") != std::string::npos) return 0;
  if (reply.find("+CME ERROR: SIM PIN required") != std::string::npos) return 1;
  return -1;
}

int USBModem_SIMHandler::ChangePINEnable(std::string const& pin, bool enable) {
  if (!IsSafeModemText(pin)) {
    VORN_LOG(LOG_ERR, "error on modem cmd: enable pin protection: refused characters in the PIN");
    return -1;
  }
  if (_PINStatus != SIM_READY) UpdateSIMStatus();
  if (_PINStatus != SIM_READY) {
    VORN_LOG(LOG_ERR, "Cannot change enable when SIM is not ready");
    return -1;
  }
  int current = GetPINEnable();
  if (current < 0) {
    VORN_LOG(LOG_ERR, "error on getting current PIN enable setting");
    return -1;
  }
  if ((current == 1) == enable) return 0;
  std::string reply;
  if (SendModemCommand(_atif->GetATCommandChangePINEnable(enable ? "1" : "0", pin), reply) != 0) {
    VORN_LOG(LOG_ERR, "error on modem cmd: enable pin protection");
    return -1;
  }
  if (_atif->ParseRetStringIsOK(reply) != 0) {
    VORN_LOG(LOG_ERR, "error on enable PIN protection, ret: %s", reply.c_str());
    return -2;
  }
  return 0;
}

int USBModem_SIMHandler::ChangePIN(std::string const& oldPin, std::string const& newPin) {
  if (!IsSafeModemText(oldPin) || !IsSafeModemText(newPin)) {
    VORN_LOG(LOG_ERR, "error on modem cmd: change pin: refused characters in the PIN");
    return -1;
  }
  if (_PINStatus != SIM_READY) UpdateSIMStatus();
  if (_PINStatus != SIM_READY) {
    VORN_LOG(LOG_ERR, "Cannot change PIN when SIM is not ready");
    return -1;
  }
  if (oldPin.empty() || newPin.empty()) {
    VORN_LOG(LOG_ERR, "error on change pin: input args should not be null");
    return -1;
  }
  std::string reply;
  if (SendModemCommand(_atif->GetATCommandChangePINCode(oldPin, newPin), reply) != 0) {
    VORN_LOG(LOG_ERR, "error on modem cmd: change pin");
    return -1;
  }
  if (_atif->ParseRetStringIsOK(reply) != 0) {
    VORN_LOG(LOG_ERR, "error on changing PIN, ret: %s", reply.c_str());
    return -2;
  }
  return 0;
}

int USBModem_SIMHandler::PINSet(std::string const& oldPin, std::string const& newPin,
                                bool protection) {
  int ret = ChangePINEnable(oldPin, protection);
  if (ret != 0) {
    VORN_LOG(LOG_ERR, "failed on PIN enable");
    return ret;
  }
  if (!newPin.empty()) {
    ret = ChangePIN(oldPin, newPin);
    if (ret != 0) {
      VORN_LOG(LOG_ERR, "failed on change PIN");
      return ret;
    }
  }
  return 0;
}

namespace {

bool StatusAllowsAttemptQuery(int status) {
  return !(status == SIM_MUTE ||
           status == SIM_BUSY ||
           status == SIM_ERROR ||
           status == SIM_UNKNOWN);
}

}  // namespace

int USBModem_SIMHandler::PINGetAttemptRemain() {
  if (!StatusAllowsAttemptQuery(_PINStatus) || !_atif) return -1;
  std::string const cmd = _atif->GetATCommandPINAttempt();
  std::string reply;
  if (SendModemCommand(cmd, reply) != 0) {
    VORN_LOG(LOG_ERR, "error on sending commmand (%s)", cmd.c_str());
    return -1;
  }
  std::string field;
  if (_atif->ParseRetStringPINRemainAttempt(reply, field) != 0) {
    VORN_LOG(LOG_ERR, "error on parsing AT command ret string: (%s)", reply.c_str());
    return -1;
  }
  return atoi(field.c_str());
}

int USBModem_SIMHandler::PUKGetAttemptRemain() {
  if (!StatusAllowsAttemptQuery(_PINStatus) || !_atif) return -1;
  std::string const cmd = _atif->GetATCommandPUKAttempt();
  std::string reply;
  if (SendModemCommand(cmd, reply) != 0) {
    VORN_LOG(LOG_ERR, "error on sending commmand (%s)", cmd.c_str());
    return -1;
  }
  std::string field;
  if (_atif->ParseRetStringPUKRemainAttempt(reply, field) != 0) {
    VORN_LOG(LOG_ERR, "error on parsing AT command ret string: (%s)", reply.c_str());
    return -1;
  }
  return atoi(field.c_str());
}

// ---- cached identity ----

namespace {

// An IMSI names the profile file: digits only, at most 15 of them.
bool IsValidIMSI(std::string const& imsi) {
  if (imsi.empty() || imsi.size() > 15) return false;
  for (char c : imsi) {
    if (c < '0' || c > '9') return false;
  }
  return true;
}

std::string TrimBlanks(std::string const& text) {
  size_t b = text.find_first_not_of(" \t\r\n");
  if (b == std::string::npos) return std::string();
  size_t e = text.find_last_not_of(" \t\r\n");
  return text.substr(b, e - b + 1);
}

}  // namespace

std::string USBModem_SIMHandler::GetIMSI(bool& error) {
  if (_imsi.empty() && _PINStatus == SIM_READY && _atif) {
    std::string const cmd = _atif->GetATCommandGetIMSI();
    std::string reply;
    std::string value;
    if (SendModemCommand(cmd, reply) != 0) {
      VORN_LOG(LOG_ERR, "error on sending commmand %s", cmd.c_str());
      error = true;
    } else if (_atif->ParseRetStringDefaultFormat(reply, value) != 0) {
      VORN_LOG(LOG_ERR, "error on parsing imsi, ret (%s)", reply.c_str());
      error = true;
    } else if (!IsValidIMSI(TrimBlanks(value))) {
      VORN_LOG(LOG_ERR, "error on parsing imsi, ret (%s)", reply.c_str());
      error = true;
    } else {
      _imsi = TrimBlanks(value);
    }
  } else if (_imsi.empty()) {
    // Without a ready SIM there is no IMSI to be had, and none to name a profile after.
    error = true;
  }
  return _imsi;
}

// Asks the modem once for a text that does not change while the SIM stays (vendor, product,
// default ISP and APN) and keeps it in cache; a failure sets the error flag and keeps nothing.
void USBModem_SIMHandler::QueryCached(std::string const& cmd,
                                      int (USBModem_ATIF::*parse)(std::string const&, std::string&),
                                      char const* what, std::string& cache, bool& error) {
  std::string reply;
  std::string value;
  if (SendModemCommand(cmd, reply) != 0) {
    VORN_LOG(LOG_ERR, "error on sending commmand %s", cmd.c_str());
    error = true;
  } else if ((_atif.get()->*parse)(reply, value) != 0) {
    VORN_LOG(LOG_ERR, "error on parsing %s, ret (%s)", what, reply.c_str());
    error = true;
  } else {
    cache = value;
  }
}

std::string USBModem_SIMHandler::GetVendorName(bool& error) {
  if (_vendorName.empty() && _atif) {
    QueryCached(_atif->GetATCommandGetVendorName(), &USBModem_ATIF::ParseRetStringDefaultFormat, "vendor name", _vendorName, error);
  }
  return _vendorName;
}

std::string USBModem_SIMHandler::GetProductName(bool& error) {
  if (_productName.empty() && _atif) {
    QueryCached(_atif->GetATCommandGetProductName(), &USBModem_ATIF::ParseRetStringDefaultFormat, "product name", _productName, error);
  }
  return _productName;
}

std::string USBModem_SIMHandler::GetDefaultISP(bool& error) {
  if (_defaultISP.empty() && _atif) {
    QueryCached(_atif->GetATCommandGetDefaultISP(), &USBModem_ATIF::ParseRetStringDefaultISP, "default isp", _defaultISP, error);
  }
  return _defaultISP;
}

std::string USBModem_SIMHandler::GetDefaultAPN(bool& error) {
  if (_defaultAPN.empty() && _atif) {
    QueryCached(_atif->GetATCommandGetDefaultAPN(), &USBModem_ATIF::ParseRetStringDefaultAPN, "default apn", _defaultAPN, error);
  }
  return _defaultAPN;
}

Json::Value USBModem_SIMHandler::GetDefaultAPNList(bool& error) {
  bool const cached = _defaultAPNList.isArray() && _defaultAPNList.size() > 0;
  if (!cached && _PINStatus != SIM_MUTE && _atif) {
    std::string const cmd = _atif->GetATCommandGetDefaultAPN();
    std::string reply;
    Json::Value list(Json::arrayValue);
    if (SendModemCommand(cmd, reply) != 0) {
      VORN_LOG(LOG_ERR, "error on sending commmand %s", cmd.c_str());
      error = true;
    } else if (_atif->ParseRetStringDefaultAPNList(reply, list) != 0 || !list.isArray()) {
      VORN_LOG(LOG_ERR, "error on parsing default apn list, ret (%s)", reply.c_str());
      error = true;
    } else {
      _defaultAPNList = list;
    }
  }
  return _defaultAPNList;
}

std::string USBModem_SIMHandler::GetRoaming(bool& error) {
  if (_PINStatus != SIM_MUTE && _atif) {
    std::string const cmd = _atif->GetATCommandGetRoaming();
    std::string reply;
    std::string value;
    if (SendModemCommand(cmd, reply) != 0) {
      VORN_LOG(LOG_ERR, "error on sending commmand %s", cmd.c_str());
      error = true;
    } else if (_atif->ParseRetStringGetRoaming(reply, value) != 0) {
      VORN_LOG(LOG_ERR, "error on parsing roaming stats");
      error = true;
    } else {
      _roaming = value;
    }
  }
  return _roaming;
}

int USBModem_SIMHandler::GetSignalQuality(bool& error) {
  if (_PINStatus == SIM_READY && _atif) {
    _signal = 0;
    std::string const cmd = _atif->GetATCommandGetRSSI();
    std::string reply;
    int level = 0;
    if (SendModemCommand(cmd, reply) != 0) {
      VORN_LOG(LOG_ERR, "error on sending cmd (%s) for rssi", cmd.c_str());
      error = true;
    } else if (_atif->ParseRetStringGetSignalLevel(reply, level) != 0) {
      VORN_LOG(LOG_ERR, "cannot get signal strength, ret (%s)", reply.c_str());
      error = true;
    } else {
      _signal = level;
    }
  }
  return _signal;
}

// ---- reports ----

Json::Value USBModem_SIMHandler::GetSimInfo(bool& error) {
  Json::Value info(Json::objectValue);
  info["sim_status"] = GetPINStatus(error);
  info["pin_protected"] = GetPINEnable() != 0 ? "true" : "false";
  info["pin_remains"] = PINGetAttemptRemain();
  info["puk_remains"] = PUKGetAttemptRemain();
  return info;
}

Json::Value USBModem_SIMHandler::GetUSBModemData(bool& error) {
  std::string const status = GetPINStatus(error);
  Json::Value data(Json::objectValue);
  if (_PINStatus == SIM_READY || _PINStatus == SIM_MUTE) {
    data["product"] = GetProductName(error);
    data["vendor"] = GetVendorName(error);
    data["signal"] = GetSignalQuality(error);
    data["carrier"] = GetDefaultISP(error);
    data["sim_status"] = status;
    data["default_apn_list"] = GetDefaultAPNList(error);
    data["profile"] = GetProfile(error);
  } else {
    data["product"] = "";
    data["vendor"] = "";
    data["signal"] = 0;
    data["carrier"] = "";
    data["sim_status"] = status;
    data["default_apn_list"] = Json::Value(Json::arrayValue);
    data["profile"] = Json::Value(Json::objectValue);
  }
  return data;
}

// ---- node handler forwarders ----

int USBModem_SIMHandler::GetConnectNode(std::string& node) {
  if (!_nodeHandler) return -1;
  return _nodeHandler->GetConnectNode(node);
}

void USBModem_SIMHandler::ReleaseConnectNode() {
  if (_nodeHandler) _nodeHandler->ReleaseConnectNode();
}

int USBModem_SIMHandler::ModemCmd(std::string const& cmd, std::string& reply) {
  return SendModemCommand(cmd, reply);
}

}  // namespace usbmodem_lib
}  // namespace vornwireless
