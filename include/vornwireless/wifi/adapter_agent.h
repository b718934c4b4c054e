// The agent of one adapter: the strategy object that turns an AdapterConfig into the driver's
// files and commands and runs the radio. Adapter owns one and forwards to it.
#ifndef VORNWIRELESS_WIFI_ADAPTER_AGENT_H
#define VORNWIRELESS_WIFI_ADAPTER_AGENT_H

#include <string>
#include <vector>

#include "vornwireless/wifi/adapter_config.h"
#include "vornwireless/wifi/enum.h"
#include "vornwireless/wifi/utils.h"

namespace vornwireless {
namespace wifi {

class AdapterAgent {
 public:
  // A maker of agents for a configuration; null when it has none for it.
  typedef AdapterAgent* (*Maker)(const AdapterConfig& config);

  // A new agent for the configuration's adapter, or null. No agent kind is built into the
  // library yet: until a maker is registered, Create gives null, so Adapter::Create fails and
  // no adapter is listed.
  static AdapterAgent* Create(const AdapterConfig& config);
  static void Delete(const AdapterAgent* agent);  // null allowed
  // Installs the maker Create asks (null removes it). The previous maker is returned.
  static Maker SetMaker(Maker maker);

  // 0 on success, -1 on failure unless told otherwise.
  virtual int Enable(const AdapterConfig& config) = 0;
  virtual int Recover(const AdapterConfig& config) = 0;
  virtual int Disable(const AdapterConfig& config) = 0;
  virtual int Reload(const AdapterConfig& config, RELOAD_STATUS status) = 0;
  virtual WIFI_STATUS GetStatus(const AdapterConfig& config) const = 0;
  virtual int ScanNetworks(const AdapterConfig& config,
                           std::vector<AdapterConfig::StationInfo>& stations) = 0;
  virtual int LoadStationConnData(std::vector<utils::ConnectionInfo>& list) = 0;
  virtual int EnableWPSWithPBC() = 0;
  virtual int EnableWPSWithPinCode(const std::string& pin) = 0;
  // Tells the radio the country; true on success. The base does nothing and says true.
  virtual bool SetCountryCodeImpl(const std::string& code) const;
  virtual ~AdapterAgent();

  std::string ifname;  // the interface the agent serves, set by the factory

 protected:
  AdapterAgent() = default;

 private:
  AdapterAgent(const AdapterAgent&) = delete;
  AdapterAgent& operator=(const AdapterAgent&) = delete;
};

}  // namespace wifi
}  // namespace vornwireless

#endif
