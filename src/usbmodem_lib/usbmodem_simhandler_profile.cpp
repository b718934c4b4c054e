// The dial profile of a SIM: one section in /var/lib/usbmodem/usbmodem.profile.<IMSI>, made
// from what the SIM and the network list tell on first use, read and updated key by key.
#include <fcntl.h>
#include <sys/stat.h>
#include <sys/types.h>
#include <unistd.h>

#include <cctype>
#include <cstdio>
#include <fstream>

#include "vornplatform/log.h"
#include "vornplatform/vlibc.h"
#include "vornwireless/usbmodem_lib/usbmodem_atif.h"
#include "vornwireless/usbmodem_lib/usbmodem_simhandler.h"

namespace vornwireless {
namespace usbmodem_lib {

const char* const USBModem_SIMHandler::kProfileDir = "/var/lib/usbmodem";
const char* const USBModem_SIMHandler::kProfilePrefix = "/var/lib/usbmodem/usbmodem.profile.";
const char* const USBModem_SIMHandler::kProfileSection = "USBModem Profile";
const char* const USBModem_SIMHandler::kNetworkListPath = "/usr/share/usbmodem/wcdma_list.json";

namespace {

const int kKeyBufferSize = 1024;
const int kHashSize = 1024;

// A key the profile file can hold and give back: not empty, no '=' or line break, no leading
// '#' or '[', no blank at either end.
bool IsStorableKey(std::string const& key) {
  if (key.empty() || key.size() > 255) return false;
  if (key.find_first_of("=\r\n") != std::string::npos) return false;
  if (key[0] == '#' || key[0] == '[') return false;
  if (isblank(static_cast<unsigned char>(key.front())) ||
      isblank(static_cast<unsigned char>(key.back())))
    return false;
  return true;
}

// A value that reads back whole through the 1024-byte key buffer.
bool IsStorableValue(std::string const& value) {
  return value.size() < static_cast<size_t>(kKeyBufferSize) &&
         value.find_first_of("\r\n") == std::string::npos &&
         value.find('\0') == std::string::npos;
}

// The text a profile member is stored as, or false when the member cannot be stored (arrays
// and objects have no text form).
bool MemberText(Json::Value const& member, std::string& text) {
  if (!member.isConvertibleTo(Json::stringValue)) return false;
  try {
    text = member.asString();
  } catch (std::exception const&) {
    return false;
  }
  return true;
}

// Creates path (when missing) readable by its owner only, from the first byte on: it holds
// secrets. 0; -1 with errno set.
int CreatePrivateFile(std::string const& path) {
  const int fd = open(path.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC | O_NOCTTY, 0600);
  if (fd < 0) return -1;
  const int rc = fchmod(fd, 0600);
  close(fd);
  return rc;
}

}  // namespace

int USBModem_SIMHandler::InitProfile() {
  if (_profilePath.empty()) {
    bool error = false;
    std::string const imsi = GetIMSI(error);
    _profilePath = std::string(kProfilePrefix) + imsi;
    if (error) {
      VORN_LOG(LOG_ERR, "Error on init profile: failed to get imsi");
      _profilePath.clear();
      return -1;
    }
  }
  if (VLIBCFileExist(_profilePath.c_str()) != 1) {
    if (ResetProfile() < 0) {
      VORN_LOG(LOG_ERR, "Error on init profile: reset %s", _profilePath.c_str());
      return -1;
    }
  }
  if (chmod(_profilePath.c_str(), 0600) != 0) {
    VORN_LOG(LOG_ERR, "Failed to chmod for file [%s]", _profilePath.c_str());
    return -1;
  }
  return 0;
}

int USBModem_SIMHandler::ResetProfile() {
  bool error = false;
  std::string const imsi = GetIMSI(error);
  _profilePath = std::string(kProfilePrefix) + imsi;
  if (error) {
    _profilePath.clear();
    return -1;
  }
  if (VLIBCFileCheckDir(kProfileDir) != 1) {
    // The mode is meant as given, whatever the process's umask.
    if (mkdir(kProfileDir, 0775) != 0 || chmod(kProfileDir, 0775) != 0) {
      VORN_LOG(LOG_ERR, "Error on reset profile: makedir %s failed", kProfileDir);
      return -1;
    }
  }
  if (VLIBCFileExist(_profilePath.c_str()) == 1) unlink(_profilePath.c_str());
  if (CreatePrivateFile(_profilePath) < 0) {
    VORN_LOG(LOG_ERR, "Error on reset profile: touch profile %s", _profilePath.c_str());
  }
  PVLIBSZHASH hash = VLIBCSzHashAlloc(kHashSize);
  if (hash == NULL) {
    VORN_LOG(LOG_ERR, "Error on reset profile: hash alloc");
    return -1;
  }
  VLIBCSzHashSetValue(hash, "number", "*99***1#");
  VLIBCSzHashSetValue(hash, "user", "Unknown");
  VLIBCSzHashSetValue(hash, "pass", "Unknown");
  VLIBCSzHashSetValue(hash, "IMSI", imsi.c_str());
  VLIBCSzHashSetValue(hash, "default_gw", "false");
  bool locationError = false;
  VLIBCSzHashSetValue(hash, "location", GetDefaultLocation(locationError).c_str());
  bool modemError = false;
  std::string const isp = GetDefaultISP(modemError);
  std::string const apn = GetDefaultAPN(modemError);
  VLIBCSzHashSetValue(hash, "apn", apn.c_str());
  std::string label = isp;
  if (!isp.empty() && !apn.empty()) label += " - " + apn;
  VLIBCSzHashSetValue(hash, "isp", label.c_str());
  int ret = VLIBCFileAddSection(_profilePath.c_str(), kProfileSection, hash, "%s=%s\n");
  VLIBCSzHashFree(hash);
  if (ret != 1) {
    VORN_LOG(LOG_ERR, "Error on reset profile: section %s in profile %s", kProfileSection,
             _profilePath.c_str());
    return -1;
  }
  return 0;
}

bool USBModem_SIMHandler::ReadAPNData(Json::Value& value) {
  std::ifstream stream(kNetworkListPath, std::ifstream::binary);
  bool ok = false;
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"
  Json::Reader reader;
  try {
    ok = stream.is_open() && reader.parse(stream, value, true);
  } catch (std::exception const&) {
    ok = false;
  }
#pragma GCC diagnostic pop
  if (!ok) {
    VORN_LOG(LOG_ERR, "Failed to parse json file [%s]", kNetworkListPath);
    return false;
  }
  return true;
}

std::string USBModem_SIMHandler::GetDefaultLocation(bool& error) {
  std::string const isp = GetDefaultISP(error);
  if (error || isp.empty()) {
    VORN_LOG(LOG_ERR, "No ISP");
    return std::string();
  }
  Json::Value list;
  if (!ReadAPNData(list)) {
    error = true;
    VORN_LOG(LOG_ERR, "Failed to read APN data");
    return std::string();
  }
  // The list is data shipped with the system, but never trusted to be of the right shape.
  if (list.isArray()) {
    for (Json::ArrayIndex i = 0; i < list.size(); ++i) {
      Json::Value const& entry = list[i];
      if (!entry.isObject()) continue;
      if (!entry.isMember("id") || !entry["id"].isConvertibleTo(Json::stringValue)) continue;
      if (!entry.isMember("isp")) continue;
      Json::Value const& isps = entry["isp"];
      if (!isps.isArray()) continue;
      for (Json::ArrayIndex j = 0; j < isps.size(); ++j) {
        Json::Value const& item = isps[j];
        if (!item.isObject() || !item.isMember("name")) continue;
        std::string name;
        std::string id;
        if (!MemberText(item["name"], name) || !MemberText(entry["id"], id)) continue;
        if (name == isp) {
          error = false;
          return id;
        }
      }
    }
  }
  error = false;
  return std::string();
}

std::string USBModem_SIMHandler::GetProfileWithKey(std::string const& key, bool& error) {
  if (_profilePath.empty()) {
    error = true;
    return std::string();
  }
  char buf[kKeyBufferSize] = {0};
  if (VLIBCFileGetSectionValue(_profilePath.c_str(), kProfileSection, key.c_str(), buf,
                               sizeof(buf)) < 0) {
    error = true;
    return std::string();
  }
  return std::string(buf);
}

int USBModem_SIMHandler::SetProfileWithKey(std::string const& key, std::string const& value) {
  if (_profilePath.empty()) {
    VORN_LOG(LOG_ERR, "profile is not initialised, cannot set key (%s)", key.c_str());
    return -1;
  }
  if (VLIBCFileSetSectionValue(_profilePath.c_str(), kProfileSection, key.c_str(),
                               value.c_str()) != 0) {
    return -1;
  }
  // A profile file made again by the write keeps the profile's mode.
  chmod(_profilePath.c_str(), 0600);
  return 0;
}

Json::Value USBModem_SIMHandler::GetProfile(bool& error) {
  static const char* const kStringKeys[] = {"apn", "number", "user", "pass",
                                            "IMSI", "location", "isp"};
  Json::Value profile(Json::objectValue);
  bool const readable = _PINStatus == SIM_READY || _PINStatus == SIM_MUTE;
  for (const char* key : kStringKeys) {
    std::string value;
    if (readable) {
      bool keyError = false;
      value = GetProfileWithKey(key, keyError);
      if (keyError) {
        VORN_LOG(LOG_ERR, "failed on get key value [%s] [%s] [%s]", _profilePath.c_str(),
                 kProfileSection, key);
        error = true;
      }
    }
    profile[key] = value;
  }
  bool defaultGw = false;
  if (readable) {
    bool keyError = false;
    defaultGw = GetProfileWithKey("default_gw", keyError) == "true";
    if (keyError) {
      VORN_LOG(LOG_ERR, "failed on get key value [%s] [%s] [%s]", _profilePath.c_str(),
               kProfileSection, "default_gw");
      error = true;
    }
  }
  profile["default_gw"] = defaultGw;
  return profile;
}

int USBModem_SIMHandler::SetProfile(Json::Value const& value) {
  if (!value.isObject()) {
    VORN_LOG(LOG_ERR, "Failed to set profile: not a json object");
    return -1;
  }
  // Everything is checked before the first key is written, so a refused profile changes nothing.
  Json::Value::Members const names = value.getMemberNames();
  for (std::string const& name : names) {
    std::string text;
    if (!IsStorableKey(name) || !MemberText(value[name], text) || !IsStorableValue(text)) {
      VORN_LOG(LOG_ERR, "Failed to set profile on key (%s)", name.c_str());
      return -1;
    }
  }
  bool const writeAPN = value.isMember("number") && value["number"].isString() &&
                        value.isMember("apn") && value["apn"].isString();
  if (writeAPN && (!IsSafeModemText(value["number"].asString()) ||
                   !IsSafeModemText(value["apn"].asString()))) {
    VORN_LOG(LOG_ERR, "Failed to set profile: refused characters in number or apn");
    return -1;
  }
  for (std::string const& name : names) {
    std::string text;
    MemberText(value[name], text);
    if (SetProfileWithKey(name, text) != 0) {
      VORN_LOG(LOG_ERR, "Failed to set profile on key (%s)", name.c_str());
      return -1;
    }
  }
  if (writeAPN) {
    if (CheckAndWriteAPN(value["number"].asString(), value["apn"].asString()) < 0) {
      VORN_LOG(LOG_ERR, "Failed to write apn back to sim card");
      return -1;
    }
  }
  if (value.isMember("apn") && value["apn"].isString()) _defaultAPN = value["apn"].asString();
  return 0;
}

int USBModem_SIMHandler::CheckAndWriteAPN(std::string const& number, std::string const& apn) {
  // The cached status may be stale (a one-port dongle reads mute while it dials).
  if (_PINStatus != SIM_READY) UpdateSIMStatus();
  if (_PINStatus != SIM_READY) {
    VORN_LOG(LOG_ERR, "this shouldn't call if pin status is not ready (%d)", _PINStatus);
    return -1;
  }
  if (number.empty() || apn.empty()) {
    VORN_LOG(LOG_ERR, "input should not be empty string");
    return -1;
  }
  if (!IsSafeModemText(number) || !IsSafeModemText(apn)) {
    VORN_LOG(LOG_ERR, "refused characters in number or apn, skip write APN");
    return -1;
  }
  std::string dialNumber = number;
  std::string cid;
  if (number == "*99#") {
    cid = "1";
    dialNumber = "*99***1#";
  } else {
    char buf[kKeyBufferSize] = {0};
    if (number.size() < sizeof(buf) && sscanf(number.c_str(), "*99***%1023[^#]#", buf) == 1) {
      cid = buf;
    }
  }
  if (cid.size() != 1) {
    VORN_LOG(LOG_ERR, "cannot recognize input phone format (%s), skip write APN", number.c_str());
    return 0;
  }
  if (!_atif) return -1;
  std::string const cmd = _atif->GetATCommandGetDefaultAPN();
  std::string reply;
  if (ModemCmd(cmd, reply) != 0) {
    VORN_LOG(LOG_ERR, "error on sending commmand %s", cmd.c_str());
    return -1;
  }
  Json::Value list(Json::arrayValue);
  if (_atif->ParseRetStringDefaultAPNList(reply, list) != 0) {
    VORN_LOG(LOG_ERR, "error on parsing apn list, ret (%s)", reply.c_str());
    return -1;
  }
  if (!list.isArray()) {
    VORN_LOG(LOG_ERR, "error on apn list is not json array");
    return -1;
  }
  for (Json::ArrayIndex i = 0; i < list.size(); ++i) {
    Json::Value const& entry = list[i];
    if (!entry.isObject()) continue;
    std::string entryNumber;
    std::string entryAPN;
    if (!MemberText(entry["number"], entryNumber) || !MemberText(entry["apn"], entryAPN)) continue;
    if (entryNumber == dialNumber && entryAPN == apn) return 0;
  }
  std::string const setCmd = _atif->GetATCommandSetAPN(cid, apn);
  if (ModemCmd(setCmd, reply) != 0) {
    VORN_LOG(LOG_ERR, "error on sending commmand %s", setCmd.c_str());
    return -1;
  }
  if (_atif->ParseRetStringIsOK(reply) != 0) {
    VORN_LOG(LOG_ERR, "error on writing apn, ret (%s)", reply.c_str());
    return -1;
  }
  return 0;
}

}  // namespace usbmodem_lib
}  // namespace vornwireless
