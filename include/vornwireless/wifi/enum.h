// The Wi-Fi vocabulary: enumerations with fixed numbers and fixed texts, shared by D-Bus (JSON),
// the configuration files and the driver tools. EnumMap<E> maps texts to numbers and back.
#ifndef VORNWIRELESS_WIFI_ENUM_H
#define VORNWIRELESS_WIFI_ENUM_H

#include <map>
#include <string>

namespace vornwireless {
namespace wifi {

// Where a unit stands in the network.
enum WIFI_TOPOLOGY {
  WIFI_TOPOLOGY_ERROR = 0,
  WIFI_TOPOLOGY_BRIDGE = 1,
  WIFI_TOPOLOGY_ROUTER = 2,
  WIFI_TOPOLOGY_CLIENT = 3,
  WIFI_TOPOLOGY_REPEATER = 4,
};

// Radio standard.
enum WIFI_MODE {
  WIFI_MODE_ERROR = 0,
  WIFI_MODE_A = 1,
  WIFI_MODE_B = 2,
  WIFI_MODE_G = 3,
  WIFI_MODE_N = 4,
  WIFI_MODE_AN = 5,
  WIFI_MODE_BN = 6,
  WIFI_MODE_GN = 7,
  WIFI_MODE_BG = 8,
  WIFI_MODE_BGN = 9,
  WIFI_MODE_AC = 10,
  WIFI_MODE_AN_AC = 11,
};

enum WIFI_BANDWIDTH {
  WIFI_BANDWIDTH_ERROR = 0,
  WIFI_BANDWIDTH_20MHZ = 1,
  WIFI_BANDWIDTH_20_40MHZ = 2,
  WIFI_BANDWIDTH_20_40_80MHZ = 3,
};

// The values are transmit power levels.
enum WIFI_POWER {
  WIFI_POWER_ERROR = 0,
  WIFI_POWER_LOW = 2,
  WIFI_POWER_MEDIUM = 6,
  WIFI_POWER_HIGH = 10,
};

enum WIFI_SECURITY {
  WIFI_SECURITY_ERROR = 0,
  WIFI_SECURITY_DISABLED = 1,
  WIFI_SECURITY_WEP = 2,
  WIFI_SECURITY_PERSONAL_WPA = 3,
  WIFI_SECURITY_PERSONAL_WPA2 = 4,
  WIFI_SECURITY_PERSONAL_WPA_MIXED = 5,
  WIFI_SECURITY_ENTERPRISE_WPA = 6,
  WIFI_SECURITY_ENTERPRISE_WPA2 = 7,
  WIFI_SECURITY_ENTERPRISE_WPA_MIXED = 8,
};

enum WIFI_ENCRYPTION {
  WIFI_ENCRYPTION_ERROR = 0,
  WIFI_ENCRYPTION_NONE = 1,
  WIFI_ENCRYPTION_TKIP = 2,
  WIFI_ENCRYPTION_AES = 3,
  WIFI_ENCRYPTION_TKIP_AES = 4,
};

enum WIFI_MAC_FILTER_POLICY {
  WIFI_MAC_FILTER_POLICY_ERROR = 0,
  WIFI_MAC_FILTER_POLICY_DENY = 1,
  WIFI_MAC_FILTER_POLICY_ALLOW = 2,
};

enum WIFI_DRIVER {
  WIFI_DRIVER_ERROR = 0,
  WIFI_DRIVER_NL80211 = 1,
};

enum WIFI_FEATURE {
  WIFI_FEATURE_ERROR = 0,
  WIFI_FEATURE_MAC_FILTER = 1,
  WIFI_FEATURE_GUEST_NETWORK = 2,
  WIFI_FEATURE_PARENTAL_CONTROL = 3,
  WIFI_FEATURE_CONNECTION_LIST = 4,
};

// The run state of an adapter, as an agent reports it.
enum WIFI_STATUS {
  WIFI_STATUS_ERROR = 0,
  WIFI_STATUS_ENABLED = 1,
  WIFI_STATUS_IP_CONFLICT = 2,
  WIFI_STATUS_IP_FAILED = 3,
  WIFI_STATUS_DISABLED = 4,
  WIFI_STATUS_ENABLING = 5,
  WIFI_STATUS_AUTO_ENABLING = 6,
};

// The iwconfig-style operating mode of a station or scan result. Several words of different
// tools' outputs share one number; the invalid value is -1.
enum WIFI_OPMODE {
  WIFI_OPMODE_ERROR = -1,
  WIFI_OPMODE_AUTO = 0,
  WIFI_OPMODE_ADHOC = 1,
  WIFI_OPMODE_MANAGED = 2,
  WIFI_OPMODE_MASTER = 3,
  WIFI_OPMODE_REPEATER = 4,
  WIFI_OPMODE_SECONDARY = 5,
  WIFI_OPMODE_MONITOR = 6,
};

// Texts and numbers of one enumeration. Every table holds the key "error" for the invalid value.
template <typename E>
class EnumMap {
 public:
  typedef std::map<std::string, E> MapType;  // ordered by plain byte comparison of the keys

  static MapType enumMap;
  static bool blInitialized;

  // Fills the map once; a later call does nothing.
  static void initializeMap();
  // The value of the text; on a miss a logged "Failed to find key(...)" and the "error" value.
  static E StringToEnum(const std::string& text);
  // The first text in byte order whose value matches, or "error". Logs nothing.
  static std::string EnumToString(E value);
};

// The tables, one overload an enumeration. Each writes its table and returns true.
bool CreateMap(std::map<std::string, WIFI_TOPOLOGY>& map);
bool CreateMap(std::map<std::string, WIFI_MODE>& map);
bool CreateMap(std::map<std::string, WIFI_BANDWIDTH>& map);
bool CreateMap(std::map<std::string, WIFI_POWER>& map);
bool CreateMap(std::map<std::string, WIFI_SECURITY>& map);
bool CreateMap(std::map<std::string, WIFI_ENCRYPTION>& map);
bool CreateMap(std::map<std::string, WIFI_MAC_FILTER_POLICY>& map);
bool CreateMap(std::map<std::string, WIFI_DRIVER>& map);
bool CreateMap(std::map<std::string, WIFI_FEATURE>& map);
bool CreateMap(std::map<std::string, WIFI_STATUS>& map);
bool CreateMap(std::map<std::string, WIFI_OPMODE>& map);

extern template class EnumMap<WIFI_TOPOLOGY>;
extern template class EnumMap<WIFI_MODE>;
extern template class EnumMap<WIFI_BANDWIDTH>;
extern template class EnumMap<WIFI_POWER>;
extern template class EnumMap<WIFI_SECURITY>;
extern template class EnumMap<WIFI_ENCRYPTION>;
extern template class EnumMap<WIFI_MAC_FILTER_POLICY>;
extern template class EnumMap<WIFI_DRIVER>;
extern template class EnumMap<WIFI_FEATURE>;
extern template class EnumMap<WIFI_STATUS>;
extern template class EnumMap<WIFI_OPMODE>;

}  // namespace wifi
}  // namespace vornwireless

#endif
