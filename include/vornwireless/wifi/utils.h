// Free functions of the Wi-Fi code: JSON forms of the records, the schedule text, the stored
// password cipher, and reads of the machine's state (interfaces, kernel modules, topology keys,
// station data, signal strength).
#ifndef VORNWIRELESS_WIFI_UTILS_H
#define VORNWIRELESS_WIFI_UTILS_H

#include <json/json.h>

#include <ostream>
#include <string>
#include <vector>

#include "vornwireless/wifi/adapter_capability.h"
#include "vornwireless/wifi/adapter_config.h"
#include "vornwireless/wifi/enum.h"

namespace vornwireless {
namespace wifi {
namespace utils {

using MacAddress = ::vornwireless::utils::MacAddress;
using IPAddress = ::vornwireless::utils::IPAddress;

// One associated client as the agents report it.
struct ConnectionInfo {
  std::string netif;
  std::string hostname;
  IPAddress ip;
  MacAddress mac;
  std::string asso_time;
};

// ---- JSON forms ----------------------------------------------------------------------------

Json::Value GetJsonValue(const AdapterConfig& config);
Json::Value StationInfoToJson(const AdapterConfig::StationInfo& station);
// Merges a saved connection: only the members present of "essid", "bssid", "opmode",
// "security", "encryption", "user", "password", "access_time". 0, or -1 (logged, station
// untouched) when a member has a type that cannot be read.
int ConnectionJsonToStationInfo(const Json::Value& json, AdapterConfig::StationInfo& station);
Json::Value GetJsonValue(const AdapterCapability& capability);
// The text of an adapter record. 0, or -1 after one log line with the record untouched: a text
// that does not parse, a member of the wrong type, a schedule that is not 168 characters long.
int GetConfig(const std::string& json, AdapterConfig& config);
int GetConfig(const std::string& json, BridgeConfig& config);
// The styled text of a JSON value.
std::string ToStyledText(const Json::Value& value);

// Cells from a text of exactly 168 characters ("1" on, anything else off). 0, or -1 with the
// cells untouched.
int SetScheduleValue(bool* cells, const std::string& text);
// One "1" or "0" a cell.
std::string rgbltoa(const bool* cells, unsigned count);
std::string itoa(int value);

// ---- stored passwords and section files ----------------------------------------------------

int EncryptPlainText(const std::string& plain, std::string& out);   // 0, -1
int DecryptCipherText(const std::string& cipher, std::string& out); // 0, -1
// 1 when the section file at path has the section, 0 when not (or no readable file), -1 on a
// bad argument or an allocation failure.
int IsSectionExist(const std::string& path, const std::string& name);

// ---- identity of the built-in radio ---------------------------------------------------------

bool Is715SkyBuiltInWlan(const std::string& ifname);
bool Is713SkyBuiltInWlan(const std::string& ifname);
bool IsSkyBuiltInWlan(const std::string& ifname);
bool IsGuestNetworkSupport(const std::string& ifname);
int Get715SkyWlanMacAddress(MacAddress& mac);

// ---- kernel modules of the RLT driver -------------------------------------------------------

int InsertRLTKernelModule(const std::string& file);
int RemoveRLTKernelModule(const std::string& name);

// ---- interfaces -----------------------------------------------------------------------------

int GetAdapterNum();
int GetWirelessIndex(const std::string& ifname);   // N of "wlanN", else -1
int GetGuestBridgeIndex(const std::string& name);  // N of "gbrN", else -1
std::string GetBssid(const std::string& ifname);   // the kernel's text, empty when unreadable
bool IsNetActivate(const std::string& ifname);
int GetFirstExistentSlaveByBridge(const std::string& bridge, std::string& out);
std::string GetBridgeName(WIFI_TOPOLOGY topology);
void GetBridgeConfigName(WIFI_TOPOLOGY topology, std::ostream& stream);

// ---- topology keys of /etc/vorninfo.conf ----------------------------------------------------

WIFI_TOPOLOGY ReadTopology();
int WriteTopology(WIFI_TOPOLOGY topology);
int GetTopologyString(std::string& out);
int SetSupportNetTopology(bool support);
bool IsSupportTopology();
bool HasWifiDongle();
int GetSupportedMode(std::string& out);

// ---- signal and station data ----------------------------------------------------------------

int GetSignalStrength(const std::string& ifname);
int GetDHCPInfoByMAC(const MacAddress& mac, IPAddress& ip, std::string& hostname);
int GetArpInfoByMAC(const MacAddress& mac, IPAddress& ip, std::string& hostname);
Json::Value ParseConnectionList(const std::vector<ConnectionInfo>& list);
int GetConnectedAPInfo(const AdapterConfig& config, Json::Value& json);

}  // namespace utils
}  // namespace wifi
}  // namespace vornwireless

#endif
