// One wireless interface: what is wanted (AdapterData), what is possible (AdapterCapability) and
// what runs (AdapterAgent); and, on the static side, the process-wide list of adapters kept in
// step with the hardware, the unit's topology and the moves over all adapters.
#ifndef VORNWIRELESS_WIFI_ADAPTER_H
#define VORNWIRELESS_WIFI_ADAPTER_H

#include <pthread.h>

#include <boost/ptr_container/ptr_vector.hpp>
#include <string>
#include <vector>

#include "vornwireless/wifi/adapter_config.h"
#include "vornwireless/wifi/enum.h"
#include "vornwireless/wifi/utils.h"

namespace vornwireless {
namespace wifi {

class AdapterAgent;
class AdapterCapability;
class AdapterData;

class Adapter {
 public:
  typedef boost::ptr_vector<Adapter> AdapterList;

  // The unit's topology: 0 until first read, changed only by a topology switch.
  static WIFI_TOPOLOGY GetTopology();
  static AdapterList& GetList();

  // A new adapter with its record, capability and agent, or null (one log line).
  static Adapter* Create(const std::string& ifname);
  static void Delete(const Adapter* adapter);  // null allowed

  static AdapterList::iterator FindAdapter(const std::string& ifname);
  static AdapterList::iterator FindAdapter(const MacAddress& bssid);
  static Adapter* GetAdapter(const std::string& ifname);  // null when not listed

  static int AddAdapter(const std::string& ifname);     // 0, -1
  static int RemoveAdapter(const std::string& ifname);  // 0, -1
  // Brings the list in step with the wlan interfaces: > 0 changed, 0 unchanged, -1 error.
  static int RefreshAdapterList();
  static int DeleteAdapterAll();
  static int AddAgentAll();
  static int EnableAll();
  static int DisableAll();
  static int SwitchOnOff();
  // Unloads the driver of the old topology and loads that of the new one. 0, -1.
  static int SwitchKernelModule(WIFI_TOPOLOGY oldTopology, WIFI_TOPOLOGY newTopology);
  static int GetDongleCount();
  static int GetEnabledAdapterCount();
  static Adapter* GetPCIAdapter();
  static MacAddress GetAddressByIFName(const std::string& ifname);

  int Initialize();  // agent's Recover with the held configuration
  int Terminate();   // agent's Disable with the held configuration
  // Checks, stores and hands a new configuration to the agent, under _wifiMutex. 0, -1.
  int Apply(const AdapterConfig& config);
  int ExecSchedule();
  WIFI_STATUS GetStatus() const;
  const AdapterConfig& GetConfig() const;
  const AdapterCapability& GetCapability() const;
  bool IsTopology(WIFI_TOPOLOGY t) const;
  bool HasNullMember() const;
  int ScanNetworks(std::vector<AdapterConfig::StationInfo>& stations);
  int LoadStationConnData(std::vector<utils::ConnectionInfo>& list);
  int EnableWPSWithPBC();
  int EnableWPSWithPinCode(const std::string& pin);
  bool SetCountryCodeImpl(const std::string& code);
  // The per-adapter switch has no work of its own: always 0.
  int SwitchTopology(WIFI_TOPOLOGY t);

  ~Adapter();

  static AdapterList list;
  static WIFI_TOPOLOGY topology;
  static pthread_mutex_t _wifiMutex;

 private:
  Adapter(AdapterAgent* agent, AdapterData* data, AdapterCapability* capability);
  Adapter(const Adapter&) = delete;
  Adapter& operator=(const Adapter&) = delete;

  AdapterAgent* _agent;
  AdapterData* _data;
  AdapterCapability* _capability;
};

}  // namespace wifi
}  // namespace vornwireless

#endif
