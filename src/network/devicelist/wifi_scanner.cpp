// The Wi-Fi scanner: stations of every hostapd interface, with iw's counters and signal.
#include "vornwireless/network/devicelist/wifi_scanner.h"

#include <regex.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <new>

#include "network/devicelist/scanner_util.h"
#include "vornplatform/devicelist.h"
#include "vornplatform/log.h"
#include "vornplatform/proc.h"

namespace vornnetwork {
namespace network {
namespace module {

namespace {
WifiScanner* _gWifiScanner = nullptr;
char const kMacPattern[] = "^([0-9a-fA-F][0-9a-fA-F]:){5}([0-9a-fA-F][0-9a-fA-F])$";
}  // namespace

WifiScanner* WifiScanner::Inst() {
  if (_gWifiScanner == nullptr) _gWifiScanner = new (std::nothrow) WifiScanner();
  return _gWifiScanner;
}

int WifiScanner::Start() { return 0; }
int WifiScanner::Stop() { return 0; }

Json::Value WifiScanner::GetData() {
  GetHostapdData();
  Json::Value data = _clientList.GetClientList();
  _clientList.EraseList();
  return data;
}

int WifiScanner::ConvertDbmToPercent(int dbm) {
  if (dbm >= -35) return 100;
  if (dbm <= -100) return 0;
  // ((dbm + 100) * 100) / 65, rounded up
  return ((dbm + 100) * 100 + 64) / 65;
}

int WifiScanner::RegMatch(char const* text, char const* pattern) {
  regex_t re;
  if (regcomp(&re, pattern, REG_EXTENDED | REG_NOSUB) != 0) return -1;
  int rc = regexec(&re, text, 0, nullptr, 0) == 0 ? 1 : 0;
  regfree(&re);
  return rc;
}

int WifiScanner::GetHostapdData() {
  if (VLIBNetTopologyGet(0) <= 1) return 0;
  FILE* fp = VLIBCPopen(VORN_HOSTAPD_CLI, "r", "interface", static_cast<char const*>(nullptr));
  if (fp == nullptr) {
    int err = errno;
    VORN_LOG(LOG_ERR, "Failed to execute cmd [%s, error(%d):(%s)", VORN_HOSTAPD_CLI, err,
             std::strerror(err));
    return -1;
  }
  std::vector<std::string> names;
  std::string line;
  while (ReadLine(fp, line)) {
    if (line.find("Selected interface") != std::string::npos) continue;
    if (line.find("wlan") == std::string::npos) continue;
    // The whole line is the name, less its line end.
    if (!line.empty() && line[line.size() - 1] == '\n') line.erase(line.size() - 1);
    names.push_back(line);
  }
  VLIBCPclose(fp);
  for (std::string const& name : names) {
    if (GetStationByIfName(name) < 0) {
      VORN_LOG(LOG_ERR, "Failed to get connection list for [%s]", name.c_str());
    }
  }
  return 0;
}

int WifiScanner::GetStationByIfName(std::string const& ifname) {
  FILE* fp = VLIBCPopen(VORN_HOSTAPD_CLI, "r", "-i", ifname.c_str(), "all_sta",
                        static_cast<char const*>(nullptr));
  if (fp == nullptr) {
    int err = errno;
    VORN_LOG(LOG_ERR, "Failed to execute cmd [%s], error(%d):(%s)", VORN_HOSTAPD_CLI, err,
             std::strerror(err));
    return -1;
  }
  std::vector<std::string> macs;
  std::string line;
  while (ReadLine(fp, line)) {
    std::vector<std::string> words = SplitBlanks(line);
    if (words.empty()) continue;
    if (RegMatch(words[0].c_str(), kMacPattern) == 1) macs.push_back(words[0]);
  }
  VLIBCPclose(fp);
  for (std::string const& mac : macs) AppendClientList(mac, ifname);
  return 0;
}

int WifiScanner::AppendClientList(std::string const& mac, std::string const& ifname) {
  Json::Value object(Json::objectValue);
  object["connection"] = "wifi";
  object["netif"] = ifname;
  object["macAddr"] = mac;
  if (GetIwDevInfo(object) < 0) VORN_LOG(LOG_ERR, "failed to iw dev for wifi data");
  if (!_clientList.UpdateKeysByMac(mac, object, true)) {
    VORN_LOG(LOG_ERR, "failed to update key for wifi data");
  }
  return 0;
}

int WifiScanner::GetIwDevInfo(Json::Value& object) {
  if (!object.isObject() || !object["netif"].isString() || !object["macAddr"].isString()) {
    VORN_LOG(LOG_ERR, "cannot find ifname or mac from json data");
    return -1;
  }
  std::string const ifname = object["netif"].asString();
  std::string const mac = object["macAddr"].asString();
  FILE* fp = VLIBCPopen(VORN_IW, "r", "dev", ifname.c_str(), "station", "get", mac.c_str(),
                        static_cast<char const*>(nullptr));
  if (fp == nullptr) {
    int err = errno;
    VORN_LOG(LOG_ERR, "Failed to execute cmd [iw], error(%d):(%s)", err, std::strerror(err));
    return -1;
  }
  std::string line;
  while (ReadLine(fp, line)) {
    std::vector<std::string> words = SplitBlanks(line);
    if (words.size() < 3) continue;
    if (line.find("rx bytes") != std::string::npos) {
      object["transferRX"] = words[2];
    } else if (line.find("tx bytes") != std::string::npos) {
      object["transferTX"] = words[2];
    } else if (line.find("signal avg") != std::string::npos) {
      object["signalstrength"] = ConvertDbmToPercent(std::atoi(words[2].c_str()));
      break;
    }
  }
  // Whatever iw still prints is read away before it is waited for.
  while (ReadLine(fp, line)) {
  }
  VLIBCPclose(fp);
  return 0;
}

}  // namespace module
}  // namespace network
}  // namespace vornnetwork
