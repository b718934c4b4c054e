// What one adapter can offer (topologies, features, modes, bandwidths, channels, power levels,
// security kinds, limits) and whether a new configuration stays inside that. The generic class
// asks the wireless tools; the two built-in radios of wireless models carry fixed knowledge.
#ifndef VORNWIRELESS_WIFI_ADAPTER_CAPABILITY_H
#define VORNWIRELESS_WIFI_ADAPTER_CAPABILITY_H

#include <cstdint>
#include <map>
#include <string>
#include <vector>

#include "vornwireless/wifi/adapter_config.h"
#include "vornwireless/wifi/enum.h"

namespace vornwireless {
namespace wifi {

class AdapterCapability {
 public:
  struct Channel {
    uint32_t id = 0;        // channel number
    std::string frequency;  // gigahertz with three places and "GHz", e.g. "2.412GHz"
  };

  static AdapterCapability* Create(const std::string& ifname, const AdapterConfig& config);
  static void Delete(const AdapterCapability* capability);  // null allowed

  // 0 when the record keeps inside what the adapter can do; else -1 after one log line.
  virtual int Verify(const AdapterConfig& config) const;
  virtual std::vector<WIFI_TOPOLOGY> GetTopology() const;
  virtual std::vector<WIFI_FEATURE> GetFeature() const;
  virtual std::vector<WIFI_MODE> GetMode() const;  // runs /sbin/iwconfig every time
  virtual std::vector<WIFI_BANDWIDTH> GetBandwidth() const;
  virtual std::vector<Channel> GetChannel() const;  // runs /sbin/iwlist every time
  virtual std::vector<WIFI_POWER> GetPower() const;
  virtual uint32_t GetMaxNumClient() const;
  virtual std::vector<WIFI_SECURITY> GetSecurity() const;
  virtual std::vector<WIFI_ENCRYPTION> GetEncryption() const;
  virtual std::vector<WIFI_MAC_FILTER_POLICY> GetMacFilterPolicy() const;
  virtual uint32_t GetGuestNetworkMaxNumClient() const;
  virtual std::vector<WIFI_SECURITY> GetGuestNetworkSecurity() const;
  virtual std::vector<WIFI_ENCRYPTION> GetGuestNetworkEncryption() const;
  virtual ~AdapterCapability();

  const std::string& GetInterface() const { return _ifname; }

  // Modes the letters of the standards text allow, in key order of modeMap: every character of
  // a key must appear somewhere in the text ("bg" gives b and g, never "bg").
  static std::vector<WIFI_MODE> GetMode(const std::string& standards);

  static std::map<std::string, WIFI_MODE> modeMap;
  static void initializeModeMap();

 protected:
  explicit AdapterCapability(const std::string& ifname);
  // For the 5 GHz modes on a link that is down: a short scan with the link up, so that the
  // driver's 5 GHz channels exist before the agent starts. 0 or -1.
  int Enable5GMode(const WIFI_MODE& mode) const;

 private:
  AdapterCapability(const AdapterCapability&) = delete;
  AdapterCapability& operator=(const AdapterCapability&) = delete;

  std::string _ifname;
};

// The built-in radio of a wireless model: all features, every record accepted.
class AdapterCapabilitySkyModel : public AdapterCapability {
 public:
  explicit AdapterCapabilitySkyModel(const std::string& ifname);
  int Verify(const AdapterConfig& config) const override;
  std::vector<WIFI_FEATURE> GetFeature() const override;
};

// The RLT radio: fixed modes, bandwidths and a fixed channel table.
class AdapterCapabilityRLT : public AdapterCapability {
 public:
  AdapterCapabilityRLT(const std::string& ifname, const AdapterConfig* config);
  int Verify(const AdapterConfig& config) const override;
  std::vector<WIFI_FEATURE> GetFeature() const override;
  std::vector<WIFI_MODE> GetMode() const override;
  std::vector<WIFI_BANDWIDTH> GetBandwidth() const override;
  std::vector<Channel> GetChannel() const override;

  static std::map<uint32_t, Channel> channelMap;

 private:
  // Kept for the agent layer; it goes stale when the adapter's record is replaced, so nothing
  // here follows it.
  [[maybe_unused]] const AdapterConfig* _config;
};

}  // namespace wifi
}  // namespace vornwireless

#endif
