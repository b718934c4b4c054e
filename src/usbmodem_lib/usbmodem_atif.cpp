#include "vornwireless/usbmodem_lib/usbmodem_atif.h"

#include <cstdio>
#include <cstdlib>
#include <mutex>
#include <sstream>
#include <vector>

#include "vornplatform/log.h"
#include "vornwireless/usbmodem_lib/usbmodem_atif_dlink.h"
#include "vornwireless/usbmodem_lib/usbmodem_atif_huawei.h"
#include "vornwireless/usbmodem_lib/usbmodem_atif_pantech.h"
#include "vornwireless/usbmodem_lib/usbmodem_atif_zoom.h"

namespace vornwireless {
namespace usbmodem_lib {

bool IsSafeATArgument(std::string const& value) {
  for (char c : value) {
    unsigned char u = static_cast<unsigned char>(c);
    if (u < 0x20 || u > 0x7e || c == '"' || c == ';') return false;
  }
  return true;
}

std::map<std::string, USBModem_ATIF::Factory> USBModem_ATIF::vendorTable;

USBModem_ATIF::~USBModem_ATIF() {}

std::string USBModem_ATIF::GetATCommandQuarySIMStatus() { return "AT+CPIN?"; }

std::string USBModem_ATIF::GetATCommandSetSIMPIN(std::string const& pin) { return "AT+CPIN=" + pin; }

std::string USBModem_ATIF::GetATCommandSetSIMPUK(std::string const& puk, std::string const& pin) {
  return "AT+CPIN=" + puk + "," + pin;
}

std::string USBModem_ATIF::GetATCommandChangePINCode(std::string const& oldPin,
                                                     std::string const& newPin) {
  return "AT+CPWD=\"SC\",\"" + oldPin + "\",\"" + newPin + "\"";
}

std::string USBModem_ATIF::GetATCommandChangePINEnable(std::string const& mode,
                                                       std::string const& pin) {
  return "AT+CLCK=\"SC\"," + mode + ",\"" + pin + "\"";
}

std::string USBModem_ATIF::GetATCommandGetPINEnable() { return "AT+CLCK=\"SC\",2"; }
std::string USBModem_ATIF::GetATCommandGetRSSI() { return "AT+CSQ"; }
std::string USBModem_ATIF::GetATCommandGetHardwareFuncLvl() { return "AT+CFUN?"; }

std::string USBModem_ATIF::GetATCommandSetHardwareFuncLvl(std::string const& level) {
  return "AT+CFUN=" + level;
}

std::string USBModem_ATIF::GetATCommandGetVendorName() { return "AT+CGMI"; }
std::string USBModem_ATIF::GetATCommandGetProductName() { return "AT+CGMM"; }
std::string USBModem_ATIF::GetATCommandGetIMSI() { return "AT+CIMI"; }
std::string USBModem_ATIF::GetATCommandGetRoaming() { return "AT+CREG?"; }
std::string USBModem_ATIF::GetATCommandGetDefaultISP() { return "AT+COPS?"; }
std::string USBModem_ATIF::GetATCommandGetDefaultAPN() { return "AT+CGDCONT?"; }
std::string USBModem_ATIF::GetATCommandPINAttempt() { return "AT+EPINC?"; }
std::string USBModem_ATIF::GetATCommandPUKAttempt() { return "AT+EPINC?"; }
std::string USBModem_ATIF::GetATCommandGetUnsolicitedReports() { return ""; }
std::string USBModem_ATIF::GetATCommandSetUnsolicitedReports(bool) { return ""; }

std::string USBModem_ATIF::GetATCommandSetAPN(std::string const& cid, std::string const& apn) {
  return "AT+CGDCONT=" + cid + ",\"ip\",\"" + apn + "\"";
}

int USBModem_ATIF::ParseRetStringQuarySIMStatus(std::string const& reply) {
  if (reply.find("+CPIN: READY") != std::string::npos) return SIM_READY;
  if (reply.find("+CPIN: SIM PIN") != std::string::npos) return SIM_PIN;
  if (reply.find("+CPIN: SIM PUK") != std::string::npos) return SIM_PUK;
  if (reply.find("BUSY") != std::string::npos) return SIM_BUSY;
  if (reply.find("SIM failure") != std::string::npos) return SIM_FAILURE;
  if (reply.find("ERROR") != std::string::npos) return SIM_ERROR;
  return SIM_UNKNOWN;
}

int USBModem_ATIF::GetLineWithDelim(std::string const& reply, char delimiter, int fieldNumber,
                                    std::string& out) {
  if (fieldNumber < 1 || reply.empty()) {
    VORN_LOG(LOG_ERR, "error on input args of GetLineWithDelim");
    return -1;
  }
  if (reply.find("ERROR") != std::string::npos) {
    VORN_LOG(LOG_ERR, "key ERROR found in input string: (%s)", reply.c_str());
    return -1;
  }
  std::string::size_type colon = reply.find(':');
  if (colon == std::string::npos) {
    VORN_LOG(LOG_ERR, "cannot find ':' in input string: (%s)", reply.c_str());
    return -1;
  }
  std::string::size_type pos = colon + 1;
  std::string field;
  for (int i = 1; i <= fieldNumber; ++i) {
    if (pos > reply.size()) {
      // The reply ended before the field asked for.
      VORN_LOG(LOG_ERR, "cannot find field %d in input string: (%s)", fieldNumber, reply.c_str());
      return -1;
    }
    std::string::size_type end = reply.find(delimiter, pos);
    if (end == std::string::npos) {
      field = reply.substr(pos);
      pos = reply.size() + 1;
    } else {
      field = reply.substr(pos, end - pos);
      pos = end + 1;
    }
  }
  out = field;
  return 0;
}

int USBModem_ATIF::ParseRetStringDefaultFormat(std::string const& reply, std::string& out) {
  if (reply.empty()) {
    VORN_LOG(LOG_ERR, "error on input string for parsing should not be empty");
    return -1;
  }
  if (reply.find("ERROR") != std::string::npos) {
    VORN_LOG(LOG_ERR, "error on input string: %s", reply.c_str());
    return -1;
  }
  std::string::size_type start = 0;
  std::string::size_type colon = reply.find(':');
  if (colon != std::string::npos) start = colon + 1;
  std::string::size_type end = reply.find('\n', start);
  out = reply.substr(start, end == std::string::npos ? std::string::npos : end - start);
  return 0;
}

int USBModem_ATIF::ParseRetStringIsOK(std::string const& reply) {
  if (reply.empty()) {
    VORN_LOG(LOG_ERR, "error on input string for parsing should not be empty");
    return -1;
  }
  if (reply.find("ERROR") != std::string::npos) return -1;
  if (reply.find("OK") != std::string::npos) return 0;
  return -1;
}

int USBModem_ATIF::ParseRetStringGetSignalLevel(std::string const& reply, int& level) {
  std::string field;
  if (GetLineWithDelim(reply, ',', 1, field) != 0) return -1;
  int value = atoi(field.c_str());
  if (value >= 32 || value < 0) {
    // 99 is the modem's "not known or not detectable".
    VORN_LOG(LOG_ERR, "invalid signal value %d in input string: (%s)", value, reply.c_str());
    return -1;
  }
  level = value * 100 / 31;
  return 0;
}

int USBModem_ATIF::ParseRetStringGetRoaming(std::string const& reply, std::string& roaming) {
  std::string field;
  if (GetLineWithDelim(reply, ',', 2, field) != 0) return -1;
  roaming = (field == "5") ? "true" : "false";
  return 0;
}

int USBModem_ATIF::ParseRetStringPINRemainAttempt(std::string const& reply, std::string& remain) {
  return GetLineWithDelim(reply, ',', 1, remain);
}

int USBModem_ATIF::ParseRetStringPUKRemainAttempt(std::string const& reply, std::string& remain) {
  return GetLineWithDelim(reply, ',', 3, remain);
}

int USBModem_ATIF::ParseRetStringDefaultISP(std::string const& reply, std::string& isp) {
  return GetLineWithDelim(reply, '"', 2, isp);
}

int USBModem_ATIF::ParseRetStringDefaultAPN(std::string const& reply, std::string& apn) {
  return GetLineWithDelim(reply, '"', 4, apn);
}

int USBModem_ATIF::ParseRetStringDefaultAPNList(std::string const& reply, Json::Value& list) {
  list = Json::Value(Json::arrayValue);
  std::istringstream words(reply);
  std::string word;
  while (words >> word) {
    if (word.find("CGDCONT") != std::string::npos) continue;
    if (word == "ERROR") {
      VORN_LOG(LOG_ERR, "error on input string: %s", reply.c_str());
      return -1;
    }
    if (word == "OK") return 0;
    // One context: <cid>,"<type>","<apn>",<address>,...
    std::vector<char> cid(word.size() + 1, '\0');
    std::vector<char> apn(word.size() + 1, '\0');
    if (sscanf(word.c_str(), "%[^,],\"%*[^\"]\",\"%[^\"]\",%*s", cid.data(), apn.data()) != 2) {
      continue;
    }
    Json::Value entry(Json::objectValue);
    entry["number"] = std::string("*99***") + cid.data() + "#";
    entry["apn"] = std::string(apn.data());
    list.append(entry);
  }
  VORN_LOG(LOG_ERR, "cannot find OK in input string: (%s)", reply.c_str());
  return -1;
}

void USBModem_ATIF::CreateVendorHash() {
  vendorTable["12d1"] = CreateATIFHuawei;
  vendorTable["2001"] = CreateATIFDLink;
  vendorTable["106c"] = CreateATIFPantech;
  vendorTable["230d"] = CreateATIFZoom;
}

USBModem_ATIF* USBModem_ATIF::CreateATIF(std::string const& vendor) {
  static std::once_flag filled;
  std::call_once(filled, CreateVendorHash);
  std::map<std::string, Factory>::const_iterator it = vendorTable.find(vendor);
  if (it != vendorTable.end()) return it->second();
  VORN_LOG(LOG_ERR, "Unknown vendor id %s, assign default ATIF", vendor.c_str());
  return new USBModem_ATIF();
}

void USBModem_ATIF::DeleteATIF(USBModem_ATIF* atif) { delete atif; }

}  // namespace usbmodem_lib
}  // namespace vornwireless
