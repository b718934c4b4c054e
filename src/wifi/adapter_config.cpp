// The adapter record: zero values by default, copied member by member.
#include "vornwireless/wifi/adapter_config.h"

#include <algorithm>

namespace vornwireless {
namespace wifi {

AdapterConfig::AdapterConfig()
    : driver(WIFI_DRIVER_ERROR),
      enabled(false),
      display_ssid(false),
      mode(WIFI_MODE_ERROR),
      bandwidth(WIFI_BANDWIDTH_ERROR),
      channel(0),
      tx_power(WIFI_POWER_ERROR),
      max_num_client(0),
      wmm_enabled(false),
      schedule_enabled(false),
      is_pci_interface(false),
      CountryRegion(0),
      CountryRegionABand(0),
      security(WIFI_SECURITY_ERROR),
      encryption(WIFI_ENCRYPTION_ERROR),
      auth_server_Port(0),
      guest_support(false),
      guest_enabled(false),
      guest_display_ssid(false),
      guest_max_num_client(0),
      guest_security(WIFI_SECURITY_ERROR),
      guest_encryption(WIFI_ENCRYPTION_ERROR),
      guest_allow_access_guest(false),
      guest_allow_access_lan(false),
      guest_allow_access_http_https_only(false),
      guest_schedule_enabled(false),
      mac_filter_policy(WIFI_MAC_FILTER_POLICY_ERROR),
      clientenabled(false) {
  std::fill(schedule, schedule + kScheduleCells, false);
  std::fill(guest_schedule, guest_schedule + kScheduleCells, false);
}

AdapterConfig::AdapterConfig(const AdapterConfig& other) = default;
AdapterConfig& AdapterConfig::operator=(const AdapterConfig& other) = default;

bool operator==(const AdapterConfig::MacFilterRule& a, const AdapterConfig::MacFilterRule& b) {
  return a.enabled == b.enabled && a.mac == b.mac && a.desc == b.desc;
}

bool operator!=(const AdapterConfig::MacFilterRule& a, const AdapterConfig::MacFilterRule& b) {
  return !(a == b);
}

}  // namespace wifi
}  // namespace vornwireless
