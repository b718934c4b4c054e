// The tables of the Wi-Fi vocabulary and the text/number lookups over them.
#include "vornwireless/wifi/enum.h"

#include <mutex>

#include "vornplatform/log.h"

namespace vornwireless {
namespace wifi {

bool CreateMap(std::map<std::string, WIFI_TOPOLOGY>& map) {
  map["error"] = WIFI_TOPOLOGY_ERROR;
  map["bridge"] = WIFI_TOPOLOGY_BRIDGE;
  map["router"] = WIFI_TOPOLOGY_ROUTER;
  map["client"] = WIFI_TOPOLOGY_CLIENT;
  map["repeater"] = WIFI_TOPOLOGY_REPEATER;
  return true;
}

bool CreateMap(std::map<std::string, WIFI_MODE>& map) {
  map["error"] = WIFI_MODE_ERROR;
  map["a"] = WIFI_MODE_A;
  map["b"] = WIFI_MODE_B;
  map["g"] = WIFI_MODE_G;
  map["n"] = WIFI_MODE_N;
  map["an"] = WIFI_MODE_AN;
  map["bn"] = WIFI_MODE_BN;
  map["gn"] = WIFI_MODE_GN;
  map["bg"] = WIFI_MODE_BG;
  map["bgn"] = WIFI_MODE_BGN;
  map["ac"] = WIFI_MODE_AC;
  map["an+ac"] = WIFI_MODE_AN_AC;
  return true;
}

bool CreateMap(std::map<std::string, WIFI_BANDWIDTH>& map) {
  map["error"] = WIFI_BANDWIDTH_ERROR;
  map["20MHZ"] = WIFI_BANDWIDTH_20MHZ;
  map["20_40MHZ"] = WIFI_BANDWIDTH_20_40MHZ;
  map["20_40_80MHZ"] = WIFI_BANDWIDTH_20_40_80MHZ;
  return true;
}

bool CreateMap(std::map<std::string, WIFI_POWER>& map) {
  map["error"] = WIFI_POWER_ERROR;
  map["low"] = WIFI_POWER_LOW;
  map["medium"] = WIFI_POWER_MEDIUM;
  map["high"] = WIFI_POWER_HIGH;
  return true;
}

bool CreateMap(std::map<std::string, WIFI_SECURITY>& map) {
  map["error"] = WIFI_SECURITY_ERROR;
  map["disabled"] = WIFI_SECURITY_DISABLED;
  map["WEP"] = WIFI_SECURITY_WEP;
  map["PERSONAL_WPA"] = WIFI_SECURITY_PERSONAL_WPA;
  map["PERSONAL_WPA2"] = WIFI_SECURITY_PERSONAL_WPA2;
  map["PERSONAL_WPA_MIXED"] = WIFI_SECURITY_PERSONAL_WPA_MIXED;
  map["ENTERPRISE_WPA"] = WIFI_SECURITY_ENTERPRISE_WPA;
  map["ENTERPRISE_WPA2"] = WIFI_SECURITY_ENTERPRISE_WPA2;
  map["ENTERPRISE_WPA_MIXED"] = WIFI_SECURITY_ENTERPRISE_WPA_MIXED;
  return true;
}

bool CreateMap(std::map<std::string, WIFI_ENCRYPTION>& map) {
  map["error"] = WIFI_ENCRYPTION_ERROR;
  map["NONE"] = WIFI_ENCRYPTION_NONE;
  map["TKIP"] = WIFI_ENCRYPTION_TKIP;
  map["AES"] = WIFI_ENCRYPTION_AES;
  map["TKIP_AES"] = WIFI_ENCRYPTION_TKIP_AES;
  return true;
}

bool CreateMap(std::map<std::string, WIFI_MAC_FILTER_POLICY>& map) {
  map["error"] = WIFI_MAC_FILTER_POLICY_ERROR;
  map["deny"] = WIFI_MAC_FILTER_POLICY_DENY;
  map["allow"] = WIFI_MAC_FILTER_POLICY_ALLOW;
  return true;
}

bool CreateMap(std::map<std::string, WIFI_DRIVER>& map) {
  map["error"] = WIFI_DRIVER_ERROR;
  map["nl80211"] = WIFI_DRIVER_NL80211;
  return true;
}

bool CreateMap(std::map<std::string, WIFI_FEATURE>& map) {
  map["error"] = WIFI_FEATURE_ERROR;
  map["mac_filter"] = WIFI_FEATURE_MAC_FILTER;
  map["guest_network"] = WIFI_FEATURE_GUEST_NETWORK;
  map["parental_control"] = WIFI_FEATURE_PARENTAL_CONTROL;
  map["connection_list"] = WIFI_FEATURE_CONNECTION_LIST;
  return true;
}

bool CreateMap(std::map<std::string, WIFI_STATUS>& map) {
  map["error"] = WIFI_STATUS_ERROR;
  map["Enabled"] = WIFI_STATUS_ENABLED;
  map["IPConflict"] = WIFI_STATUS_IP_CONFLICT;
  map["IPFailed"] = WIFI_STATUS_IP_FAILED;
  map["Disabled"] = WIFI_STATUS_DISABLED;
  map["Enabling"] = WIFI_STATUS_ENABLING;
  map["AutoEnabling"] = WIFI_STATUS_AUTO_ENABLING;
  return true;
}

// The aliases come from different tools' outputs.
bool CreateMap(std::map<std::string, WIFI_OPMODE>& map) {
  map["error"] = WIFI_OPMODE_ERROR;
  map["Auto"] = WIFI_OPMODE_AUTO;
  map["Ad-Hoc"] = WIFI_OPMODE_ADHOC;
  map["Ad"] = WIFI_OPMODE_ADHOC;
  map["Adhoc"] = WIFI_OPMODE_ADHOC;
  map["Managed"] = WIFI_OPMODE_MANAGED;
  map["In"] = WIFI_OPMODE_MANAGED;
  map["Infra"] = WIFI_OPMODE_MANAGED;
  map["Any"] = WIFI_OPMODE_MANAGED;
  map["Master"] = WIFI_OPMODE_MASTER;
  map["Repeater"] = WIFI_OPMODE_REPEATER;
  map["Secondary"] = WIFI_OPMODE_SECONDARY;
  map["Monitor"] = WIFI_OPMODE_MONITOR;
  return true;
}

namespace {

void LogKeyNotFound(const std::string& text) {
  VORN_LOG(LOG_ERR, "Failed to find key(%s)", text.c_str());
}

}  // namespace

template <typename E>
typename EnumMap<E>::MapType EnumMap<E>::enumMap;
template <typename E>
bool EnumMap<E>::blInitialized = false;

template <typename E>
void EnumMap<E>::initializeMap() {
  // One fill per table, also when several threads ask first at the same moment.
  static std::once_flag once;
  std::call_once(once, [] { blInitialized = CreateMap(enumMap); });
}

template <typename E>
E EnumMap<E>::StringToEnum(const std::string& text) {
  initializeMap();
  typename MapType::const_iterator it = enumMap.find(text);
  if (it != enumMap.end()) return it->second;
  LogKeyNotFound(text);
  return enumMap.find("error")->second;
}

template <typename E>
std::string EnumMap<E>::EnumToString(E value) {
  initializeMap();
  for (typename MapType::const_iterator it = enumMap.begin(); it != enumMap.end(); ++it) {
    if (it->second == value) return it->first;
  }
  return "error";
}

template class EnumMap<WIFI_TOPOLOGY>;
template class EnumMap<WIFI_MODE>;
template class EnumMap<WIFI_BANDWIDTH>;
template class EnumMap<WIFI_POWER>;
template class EnumMap<WIFI_SECURITY>;
template class EnumMap<WIFI_ENCRYPTION>;
template class EnumMap<WIFI_MAC_FILTER_POLICY>;
template class EnumMap<WIFI_DRIVER>;
template class EnumMap<WIFI_FEATURE>;
template class EnumMap<WIFI_STATUS>;
template class EnumMap<WIFI_OPMODE>;

}  // namespace wifi
}  // namespace vornwireless
