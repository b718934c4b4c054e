// The plain records of Wi-Fi settings: one adapter's whole configuration (access point and client
// side), the stations it remembers or found, its MAC filter rules, a bridge's settings, and the
// reload flags an agent acts on.
#ifndef VORNWIRELESS_WIFI_ADAPTER_CONFIG_H
#define VORNWIRELESS_WIFI_ADAPTER_CONFIG_H

#include <cstdint>
#include <string>
#include <vector>

#include "vornwireless/utils/ip_address.h"
#include "vornwireless/utils/mac_address.h"
#include "vornwireless/wifi/enum.h"

namespace vornwireless {
namespace wifi {

using MacAddress = ::vornwireless::utils::MacAddress;
using IPAddress = ::vornwireless::utils::IPAddress;

// Cells of a weekly timetable: one an hour, index weekday * 24 + hour, Sunday being weekday 0.
// A true cell means the radio is on during that hour.
const unsigned kScheduleCells = 168;

// What a change asks of the agent; passed by value to its Reload.
struct RELOAD_STATUS {
  bool blConfig = false;         // take the access point down and up
  bool blPower = false;          // only the transmit power changed
  bool blSchedule = false;       // the schedule or its switch changed
  bool blGuestSchedule = false;  // the guest schedule switch changed
  bool blGuestRule = false;      // re-install the guest network's access rules
};

class AdapterConfig {
 public:
  struct MacFilterRule {
    bool enabled = false;
    MacAddress mac;
    std::string desc;
  };

  // One remembered or scanned network.
  struct StationInfo {
    std::string essid;
    MacAddress bssid;
    WIFI_OPMODE opmode = WIFI_OPMODE_AUTO;
    WIFI_SECURITY security = WIFI_SECURITY_ERROR;
    WIFI_ENCRYPTION encryption = WIFI_ENCRYPTION_ERROR;
    std::string user;
    std::string password;  // plain in memory
    uint32_t access_time = 0;  // time of the last connection
    bool is_dhcp = false;
    IPAddress ip;
    IPAddress netmask;
    IPAddress gateway;
    int32_t channel = 0;
    int32_t signal = 0;
    WIFI_MODE hwmode = WIFI_MODE_ERROR;
  };

  // Empty strings, empty addresses, empty vectors, false and zero everywhere else.
  AdapterConfig();
  AdapterConfig(const AdapterConfig& other);
  AdapterConfig& operator=(const AdapterConfig& other);

  std::string interface;  // kernel name, such as "wlan0"
  MacAddress bssid;       // the adapter's own address
  WIFI_DRIVER driver;
  bool enabled;  // the access point is wanted
  std::string ssid;
  bool display_ssid;  // broadcast the SSID
  WIFI_MODE mode;
  WIFI_BANDWIDTH bandwidth;
  uint32_t channel;  // 0 means automatic
  WIFI_POWER tx_power;
  uint32_t max_num_client;
  bool wmm_enabled;
  bool schedule_enabled;
  bool schedule[kScheduleCells];
  bool is_pci_interface;  // the built-in radio, not a USB dongle
  std::string CountryCode;
  int32_t CountryRegion;       // region number of the 2.4 GHz band for the RLT driver
  int32_t CountryRegionABand;  // region number of the 5 GHz band
  WIFI_SECURITY security;
  WIFI_ENCRYPTION encryption;
  std::string password;  // plain in memory, enciphered on disk
  IPAddress auth_server_ip;  // RADIUS server of the ENTERPRISE kinds
  uint32_t auth_server_Port;
  std::string auth_server_shared_secret;
  bool guest_support;
  bool guest_enabled;
  std::string guest_ssid;
  bool guest_display_ssid;
  MacAddress guest_bssid;  // the adapter's address plus 1 when read from disk
  uint32_t guest_max_num_client;
  WIFI_SECURITY guest_security;
  WIFI_ENCRYPTION guest_encryption;
  std::string guest_password;
  bool guest_allow_access_guest;  // guests may reach each other
  bool guest_allow_access_lan;
  bool guest_allow_access_http_https_only;
  bool guest_schedule_enabled;
  bool guest_schedule[kScheduleCells];
  WIFI_MAC_FILTER_POLICY mac_filter_policy;
  std::vector<MacFilterRule> mac_filter_list;
  bool clientenabled;  // the client side is wanted
  std::vector<StationInfo> station_list;  // in client use the first entry is the network to join
};

struct BridgeConfig {
  IPAddress ap_ip_address;
  IPAddress ap_netmask;
  bool dhcp_enabled = false;
  IPAddress dhcp_range_begin;
  IPAddress dhcp_range_end;
  std::string ap_ipv6_prefix;
  std::string ipv6_pdns;
  std::string ipv6_sdns;
  std::string dhcpv6_type;
  std::string dhcpv6_range_begin;
  std::string dhcpv6_range_end;
  std::vector<std::string> slave_list;  // interface names
};

bool operator==(const AdapterConfig::MacFilterRule& a, const AdapterConfig::MacFilterRule& b);
bool operator!=(const AdapterConfig::MacFilterRule& a, const AdapterConfig::MacFilterRule& b);

}  // namespace wifi
}  // namespace vornwireless

#endif
