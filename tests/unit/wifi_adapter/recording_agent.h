// An agent for tests: it records each call with the configuration it was given and answers with
// the results the test sets. Installed as the maker of AdapterAgent::Create.
#ifndef VORN_TESTS_UNIT_WIFI_ADAPTER_RECORDING_AGENT_H
#define VORN_TESTS_UNIT_WIFI_ADAPTER_RECORDING_AGENT_H

#include <map>
#include <string>
#include <vector>

#include "vornwireless/wifi/adapter_agent.h"

namespace vorntest {

struct AgentCall {
  std::string ifname;  // the agent's ifname
  std::string op;      // "Enable", "Reload", ...
  vornwireless::wifi::AdapterConfig config;
  vornwireless::wifi::RELOAD_STATUS status;  // for Reload
  bool mutexHeld = false;                    // Adapter::_wifiMutex was taken during the call
};

class RecordingAgent : public vornwireless::wifi::AdapterAgent {
 public:
  // What every agent made from now on answers, by operation name (0 when not set).
  static std::map<std::string, int> results;
  static vornwireless::wifi::WIFI_STATUS status;
  static std::vector<AgentCall> calls;
  static int made;
  // Interfaces for which the maker gives no agent.
  static std::vector<std::string> refused;

  static vornwireless::wifi::AdapterAgent* Make(const vornwireless::wifi::AdapterConfig& config);
  static void Reset();
  static std::vector<AgentCall> CallsOf(const std::string& op);

  int Enable(const vornwireless::wifi::AdapterConfig& c) override { return Note("Enable", c); }
  int Recover(const vornwireless::wifi::AdapterConfig& c) override { return Note("Recover", c); }
  int Disable(const vornwireless::wifi::AdapterConfig& c) override { return Note("Disable", c); }
  int Reload(const vornwireless::wifi::AdapterConfig& c,
             vornwireless::wifi::RELOAD_STATUS s) override {
    return Note("Reload", c, s);
  }
  vornwireless::wifi::WIFI_STATUS GetStatus(
      const vornwireless::wifi::AdapterConfig&) const override {
    return status;
  }
  int ScanNetworks(const vornwireless::wifi::AdapterConfig& c,
                   std::vector<vornwireless::wifi::AdapterConfig::StationInfo>&) override {
    return Note("ScanNetworks", c);
  }
  int LoadStationConnData(std::vector<vornwireless::wifi::utils::ConnectionInfo>&) override {
    return Note("LoadStationConnData", vornwireless::wifi::AdapterConfig());
  }
  int EnableWPSWithPBC() override {
    return Note("EnableWPSWithPBC", vornwireless::wifi::AdapterConfig());
  }
  int EnableWPSWithPinCode(const std::string&) override {
    return Note("EnableWPSWithPinCode", vornwireless::wifi::AdapterConfig());
  }

 private:
  int Note(const std::string& op, const vornwireless::wifi::AdapterConfig& c,
           vornwireless::wifi::RELOAD_STATUS s = vornwireless::wifi::RELOAD_STATUS());
};

}  // namespace vorntest

#endif
