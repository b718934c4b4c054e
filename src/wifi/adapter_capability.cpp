// What an adapter can do, and the check of a new record against it.
#include "vornwireless/wifi/adapter_capability.h"

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <mutex>

#include "vornplatform/log.h"
#include "vornplatform/netif_updown.h"
#include "vornplatform/proc.h"
#include "vornwireless/utils/is_sky_model.h"
#include "vornwireless/wifi/adapter.h"
#include "vornwireless/wifi/utils.h"

namespace vornwireless {
namespace wifi {

std::map<std::string, WIFI_MODE> AdapterCapability::modeMap;
std::map<uint32_t, AdapterCapability::Channel> AdapterCapabilityRLT::channelMap;

namespace {

template <typename T>
bool Contains(const std::vector<T>& values, T value) {
  return std::find(values.begin(), values.end(), value) != values.end();
}

std::string Chomp(const char* line) {
  std::string text(line);
  while (!text.empty() && (text.back() == '\n' || text.back() == '\r')) text.pop_back();
  return text;
}

}  // namespace

AdapterCapability::AdapterCapability(const std::string& ifname) : _ifname(ifname) {}
AdapterCapability::~AdapterCapability() {}

AdapterCapability* AdapterCapability::Create(const std::string& ifname,
                                             const AdapterConfig& config) {
  if (utils::Is715SkyBuiltInWlan(ifname)) return new AdapterCapabilityRLT(ifname, &config);
  if (vornwireless::utils::IsSkyModel()) return new AdapterCapabilitySkyModel(ifname);
  return new AdapterCapability(ifname);
}

void AdapterCapability::Delete(const AdapterCapability* capability) { delete capability; }

void AdapterCapability::initializeModeMap() {
  static std::once_flag once;
  std::call_once(once, [] {
    modeMap["a"] = WIFI_MODE_A;
    modeMap["b"] = WIFI_MODE_B;
    modeMap["g"] = WIFI_MODE_G;
    modeMap["n"] = WIFI_MODE_N;
    modeMap["an"] = WIFI_MODE_AN;
    modeMap["bn"] = WIFI_MODE_BN;
    modeMap["gn"] = WIFI_MODE_GN;
  });
}

std::vector<WIFI_MODE> AdapterCapability::GetMode(const std::string& standards) {
  initializeModeMap();
  std::vector<WIFI_MODE> modes;
  for (std::map<std::string, WIFI_MODE>::const_iterator it = modeMap.begin(); it != modeMap.end();
       ++it) {
    bool all = true;
    for (char c : it->first) {
      if (standards.find(c) == std::string::npos) all = false;
    }
    if (all) modes.push_back(it->second);
  }
  return modes;
}

int AdapterCapability::Verify(const AdapterConfig& c) const {
  const WIFI_TOPOLOGY topology = Adapter::GetTopology();
  if (!Contains(GetTopology(), topology)) {
    VORN_LOG(LOG_ERR, "Failed to verify topology");
    return -1;
  }
  if (topology != WIFI_TOPOLOGY_CLIENT) {
    if (!Contains(GetMode(), c.mode)) {
      VORN_LOG(LOG_ERR, "Failed to verify mode");
      return -1;
    }
    if (Enable5GMode(c.mode) < 0) {
      VORN_LOG(LOG_ERR, "Failed to check and enable 5g mode for (%s)", _ifname.c_str());
      return -1;
    }
  }
  if (!Contains(GetBandwidth(), c.bandwidth)) {
    VORN_LOG(LOG_ERR, "Failed to verify bandwidth");
    return -1;
  }
  if (!Contains(GetPower(), c.tx_power)) {
    VORN_LOG(LOG_ERR, "Failed to verify power");
    return -1;
  }
  if (!Contains(GetSecurity(), c.security)) {
    VORN_LOG(LOG_ERR, "Failed to verify security");
    return -1;
  }
  if (!Contains(GetEncryption(), c.encryption)) {
    VORN_LOG(LOG_ERR, "Failed to verify encryption");
    return -1;
  }
  if (!Contains(GetGuestNetworkSecurity(), c.guest_security)) {
    VORN_LOG(LOG_ERR, "Failed to verify guest security");
    return -1;
  }
  if (!Contains(GetGuestNetworkEncryption(), c.guest_encryption)) {
    VORN_LOG(LOG_ERR, "Failed to verify guest encryption");
    return -1;
  }
  if (c.max_num_client > GetMaxNumClient()) {
    VORN_LOG(LOG_ERR, "Failed to verify max number client");
    return -1;
  }
  if (c.guest_max_num_client > GetGuestNetworkMaxNumClient()) {
    VORN_LOG(LOG_ERR, "Failed to verify guest max number client");
    return -1;
  }
  return 0;
}

int AdapterCapability::Enable5GMode(const WIFI_MODE& mode) const {
  const int m = static_cast<int>(mode);
  if ((m & ~4) != WIFI_MODE_A && m != WIFI_MODE_AN_AC) return 0;
  if (utils::IsNetActivate(_ifname)) return 0;
  if (VLIBNetIfUp(_ifname.c_str()) == 0) {
    VORN_LOG(LOG_ERR, "Failed to interface up for (%s)", _ifname.c_str());
    return -1;
  }
  const int scan = VLIBCExec("/sbin/iwlist", _ifname.c_str(), "scanning", nullptr, nullptr);
  // The link goes down again whatever the scan gave.
  const int down = VLIBNetIfDown(_ifname.c_str());
  if (scan != 0) {
    VORN_LOG(LOG_ERR, "Failed to iwlist scanning for (%s)", _ifname.c_str());
    return -1;
  }
  if (down == 0) {
    VORN_LOG(LOG_ERR, "Failed to interface up for (%s)", _ifname.c_str());
    return -1;
  }
  return 0;
}

std::vector<WIFI_TOPOLOGY> AdapterCapability::GetTopology() const {
  return {WIFI_TOPOLOGY_CLIENT, WIFI_TOPOLOGY_BRIDGE, WIFI_TOPOLOGY_ROUTER};
}

std::vector<WIFI_FEATURE> AdapterCapability::GetFeature() const { return {}; }

std::vector<WIFI_MODE> AdapterCapability::GetMode() const {
  FILE* fp = VLIBCPopen("/sbin/iwconfig", "r", _ifname.c_str(), nullptr);
  if (fp == nullptr) {
    VORN_LOG(LOG_ERR, "Failed to get iwconfig (%s)", _ifname.c_str());
    return {};
  }
  std::string standards;
  char line[256];
  while (std::fgets(line, sizeof line, fp) != nullptr) {
    if (std::strstr(line, "IEEE 802.11") == nullptr) continue;
    char w1[256], w2[256], w3[256];
    if (std::sscanf(line, "%255s %255s %255s", w1, w2, w3) == 3) standards += w3;
  }
  VLIBCPclose(fp);
  return GetMode(standards);
}

std::vector<WIFI_BANDWIDTH> AdapterCapability::GetBandwidth() const {
  return {WIFI_BANDWIDTH_20MHZ, WIFI_BANDWIDTH_20_40MHZ};
}

std::vector<AdapterCapability::Channel> AdapterCapability::GetChannel() const {
  FILE* fp = VLIBCPopen("/sbin/iwlist", "r", _ifname.c_str(), "active_channel", nullptr);
  if (fp == nullptr) {
    VORN_LOG(LOG_ERR, "Failed to get channel (%s)", _ifname.c_str());
    return {};
  }
  std::vector<Channel> channels;
  char line[256];
  while (std::fgets(line, sizeof line, fp) != nullptr) {
    int id = 0;
    char frequency[256];
    if (std::sscanf(line, " Channel %d : %255s", &id, frequency) == 2) {
      Channel channel;
      channel.id = static_cast<uint32_t>(id);
      channel.frequency = frequency;
      channels.push_back(channel);
    } else {
      // The driver's heading line lands here too.
      VORN_LOG(LOG_ERR, "Failed to scan channels(%s, %s)", _ifname.c_str(), Chomp(line).c_str());
    }
  }
  VLIBCPclose(fp);
  return channels;
}

std::vector<WIFI_POWER> AdapterCapability::GetPower() const {
  return {WIFI_POWER_HIGH, WIFI_POWER_MEDIUM, WIFI_POWER_LOW};
}

uint32_t AdapterCapability::GetMaxNumClient() const { return 256; }

std::vector<WIFI_SECURITY> AdapterCapability::GetSecurity() const {
  return {WIFI_SECURITY_DISABLED,           WIFI_SECURITY_WEP,
          WIFI_SECURITY_PERSONAL_WPA,       WIFI_SECURITY_PERSONAL_WPA2,
          WIFI_SECURITY_PERSONAL_WPA_MIXED, WIFI_SECURITY_ENTERPRISE_WPA,
          WIFI_SECURITY_ENTERPRISE_WPA2,    WIFI_SECURITY_ENTERPRISE_WPA_MIXED};
}

std::vector<WIFI_ENCRYPTION> AdapterCapability::GetEncryption() const {
  return {WIFI_ENCRYPTION_NONE, WIFI_ENCRYPTION_TKIP, WIFI_ENCRYPTION_AES,
          WIFI_ENCRYPTION_TKIP_AES};
}

std::vector<WIFI_MAC_FILTER_POLICY> AdapterCapability::GetMacFilterPolicy() const {
  return {WIFI_MAC_FILTER_POLICY_DENY, WIFI_MAC_FILTER_POLICY_ALLOW};
}

uint32_t AdapterCapability::GetGuestNetworkMaxNumClient() const { return 256; }

std::vector<WIFI_SECURITY> AdapterCapability::GetGuestNetworkSecurity() const {
  return GetSecurity();
}

std::vector<WIFI_ENCRYPTION> AdapterCapability::GetGuestNetworkEncryption() const {
  return {WIFI_ENCRYPTION_NONE, WIFI_ENCRYPTION_TKIP, WIFI_ENCRYPTION_AES,
          WIFI_ENCRYPTION_TKIP_AES};
}

// ---- built-in radio of a wireless model ----------------------------------------------------

AdapterCapabilitySkyModel::AdapterCapabilitySkyModel(const std::string& ifname)
    : AdapterCapability(ifname) {}

int AdapterCapabilitySkyModel::Verify(const AdapterConfig&) const { return 0; }

std::vector<WIFI_FEATURE> AdapterCapabilitySkyModel::GetFeature() const {
  return {WIFI_FEATURE_MAC_FILTER, WIFI_FEATURE_GUEST_NETWORK, WIFI_FEATURE_PARENTAL_CONTROL,
          WIFI_FEATURE_CONNECTION_LIST};
}

// ---- the RLT radio -------------------------------------------------------------------------

AdapterCapabilityRLT::AdapterCapabilityRLT(const std::string& ifname, const AdapterConfig* config)
    : AdapterCapability(ifname), _config(config) {}

int AdapterCapabilityRLT::Verify(const AdapterConfig&) const { return 0; }

std::vector<WIFI_FEATURE> AdapterCapabilityRLT::GetFeature() const {
  return {WIFI_FEATURE_MAC_FILTER, WIFI_FEATURE_GUEST_NETWORK, WIFI_FEATURE_PARENTAL_CONTROL,
          WIFI_FEATURE_CONNECTION_LIST};
}

// "bn" and "ac" are not offered by this radio.
std::vector<WIFI_MODE> AdapterCapabilityRLT::GetMode() const {
  return {WIFI_MODE_A,  WIFI_MODE_B,  WIFI_MODE_G,   WIFI_MODE_N,    WIFI_MODE_AN,
          WIFI_MODE_GN, WIFI_MODE_BG, WIFI_MODE_BGN, WIFI_MODE_AN_AC};
}

std::vector<WIFI_BANDWIDTH> AdapterCapabilityRLT::GetBandwidth() const {
  return {WIFI_BANDWIDTH_20MHZ, WIFI_BANDWIDTH_20_40MHZ, WIFI_BANDWIDTH_20_40_80MHZ};
}

std::vector<AdapterCapability::Channel> AdapterCapabilityRLT::GetChannel() const {
  static std::once_flag once;
  std::call_once(once, [] {
    struct Range {
      uint32_t first, count, step;
      double frequency, frequencyStep;
    };
    const Range ranges[] = {{1, 13, 1, 2.412, 0.005},  {14, 1, 1, 2.484, 0.005},
                            {34, 8, 2, 5.170, 0.010},  {52, 4, 4, 5.260, 0.020},
                            {100, 11, 4, 5.500, 0.020}, {149, 5, 4, 5.745, 0.020}};
    for (const Range& r : ranges) {
      for (uint32_t i = 0; i < r.count; ++i) {
        Channel channel;
        channel.id = r.first + i * r.step;
        char text[32];
        std::snprintf(text, sizeof text, "%.3fGHz", r.frequency + i * r.frequencyStep);
        channel.frequency = text;
        channelMap[channel.id] = channel;
      }
    }
  });
  std::vector<Channel> channels;
  for (std::map<uint32_t, Channel>::const_iterator it = channelMap.begin(); it != channelMap.end();
       ++it) {
    channels.push_back(it->second);
  }
  return channels;
}

}  // namespace wifi
}  // namespace vornwireless
