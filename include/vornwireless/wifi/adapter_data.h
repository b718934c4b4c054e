// The stored configuration of one adapter: owns its AdapterConfig, keeps it in the files under
// /usr/vorn/etc/wifi/ (and the MAC filter files under /etc/hostapd/mac_filter/), and works out
// what a change asks of the agent (the reload flags).
#ifndef VORNWIRELESS_WIFI_ADAPTER_DATA_H
#define VORNWIRELESS_WIFI_ADAPTER_DATA_H

#include <string>

#include "vornwireless/wifi/adapter_config.h"

namespace vornwireless {
namespace wifi {

#define VORN_WIFI_CONFIG_DIR "/usr/vorn/etc/wifi/"
#define VORN_WIFI_AP_PREFIX VORN_WIFI_CONFIG_DIR "wifi_ap_"
#define VORN_WIFI_CLIENT_PREFIX VORN_WIFI_CONFIG_DIR "wifi_client_"
#define VORN_WIFI_CLIENT_OBSOLETE VORN_WIFI_CONFIG_DIR "wifi_client_obsolete"
#define VORN_MAC_FILTER_DIR "/etc/hostapd/mac_filter/"
#define VORN_MAC_FILTER_INFO VORN_MAC_FILTER_DIR "mf.info"
#define VORN_MAC_FILTER_CONF VORN_MAC_FILTER_DIR "mf.conf"

class AdapterData {
 public:
  // A record for ifname read from disk (factory defaults without a file), all five flags set.
  // Null when the record cannot be read.
  static AdapterData* Create(const std::string& ifname);
  static void Delete(const AdapterData* data);  // null allowed

  // Reads the files again; a failure keeps the held record. 0, -1.
  int Read();
  // Stores the held record by the unit's topology. Always 0: the writers log their own failures.
  int Write();
  // Takes a new record over (raising flags in router and bridge topology). 0, or -1 for a
  // topology that has no adapter settings.
  int SetConfig(const AdapterConfig& config);
  int SetAPConfig(const AdapterConfig& config);
  int SetClientConfig(const AdapterConfig& config);

  const AdapterConfig& GetConfig() const { return *_config; }

  RELOAD_STATUS GetReloadStatus() const;
  int ResetReloadStatus();   // clears all five; 0
  int EnableReloadStatus();  // sets all five; 0
  bool NeedReload() const { return false; }

 private:
  explicit AdapterData(const std::string& ifname);
  ~AdapterData();
  AdapterData(const AdapterData&) = delete;
  AdapterData& operator=(const AdapterData&) = delete;

  int WriteAP() const;
  int WriteClient() const;

  AdapterConfig* _config;
  bool blConfig;
  bool blPower;
  bool blSchedule;
  bool blGuestSchedule;
  bool blGuestRule;
};

}  // namespace wifi
}  // namespace vornwireless

#endif
