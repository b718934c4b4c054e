// The adapter: forwarding to its agent, the path of every change, and the process-wide list.
#include "vornwireless/wifi/adapter.h"

#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <fstream>
#include <memory>
#include <new>

#include "vornplatform/file.h"
#include "vornplatform/log.h"
#include "vornplatform/proc.h"
#include "vornplatform/szhash.h"
#include "vornwireless/wifi/adapter_agent.h"
#include "vornwireless/wifi/adapter_capability.h"
#include "vornwireless/wifi/adapter_data.h"

namespace vornwireless {
namespace wifi {

namespace {

const int kListSize = 1024;
const char kNetDir[] = "/sys/class/net/";
const char kDefaultsInfo[] = "/etc.defaults/vorninfo.conf";
const char kLimitKey[] = "support_wireless_number";
const char kWifiUtil[] = "/lib/udev/script/usb-wifi-util.sh";

struct ListDeleter {
  void operator()(PVLIBSZLIST l) const { VLIBCSzListFree(l); }
};
typedef std::unique_ptr<VLIBSZLIST, ListDeleter> List;

// Holds _wifiMutex for one scope.
class WifiLock {
 public:
  WifiLock() { pthread_mutex_lock(&Adapter::_wifiMutex); }
  ~WifiLock() { pthread_mutex_unlock(&Adapter::_wifiMutex); }
  WifiLock(const WifiLock&) = delete;
  WifiLock& operator=(const WifiLock&) = delete;
};

// The wlan interfaces under /sys/class/net/ into list, without those whose number is at or above
// the model's adapter limit. 0, -1.
int EnumWlan(PVLIBSZLIST* list) {
  if (list == nullptr) {
    VORN_LOG(LOG_ERR, "Input args for EnumWlan should not be null");
    return -1;
  }
  // /sys/class/net/ holds one symbolic link per interface.
  if (VLIBCFileEnumDir(kNetDir, "wlan", list, VLIBC_ENUM_DIR_LINK) < 0) {
    VORN_LOG(LOG_ERR, "Failed to enum [wlan] under [%s]", kNetDir);
    return -1;
  }
  char buf[1024] = "";
  int ret = VLIBCFileGetKeyValue(kDefaultsInfo, kLimitKey, buf, sizeof buf, 0);
  if (ret < 0) {
    VORN_LOG(LOG_ERR, "Failed to get key [%s] in file [%s]", kLimitKey, kDefaultsInfo);
    return -1;
  }
  if (ret == 0) {
    VORN_LOG(LOG_ERR, "Cannot find key [%s] in file [%s], skip setting limit for adapter number",
             kLimitKey, kDefaultsInfo);
    return 0;
  }
  errno = 0;
  char* end = nullptr;
  long limit = strtol(buf, &end, 10);
  // A value without any digit is no limit either.
  if (limit == 0 && (errno == EINVAL || end == buf)) {
    VORN_LOG(LOG_ERR, "Failed to strtol string [%s]", buf);
    return -1;
  }
  List kept(VLIBCSzListAlloc(kListSize));
  if (!kept) {
    VORN_LOG(LOG_ERR, "Failed to allocate memory");
    return -1;
  }
  PVLIBSZLIST keptRaw = kept.release();
  int count = VLIBCSzListCount(*list);
  for (int i = 0; i < count; ++i) {
    const char* name = VLIBCSzListGet(*list, i);
    if (name == nullptr) continue;
    long number = strtol(name + 4, nullptr, 10);
    if (number >= limit) continue;
    if (VLIBCSzListPush(&keptRaw, name) < 0) {
      VLIBCSzListFree(keptRaw);
      VORN_LOG(LOG_ERR, "Failed to allocate memory");
      return -1;
    }
  }
  VLIBCSzListFree(*list);
  *list = keptRaw;
  return 0;
}

bool ListHolds(PVLIBSZLIST list, const std::string& name) {
  int count = VLIBCSzListCount(list);
  for (int i = 0; i < count; ++i) {
    const char* item = VLIBCSzListGet(list, i);
    if (item != nullptr && name == item) return true;
  }
  return false;
}

}  // namespace

Adapter::AdapterList Adapter::list;
WIFI_TOPOLOGY Adapter::topology = WIFI_TOPOLOGY_ERROR;
pthread_mutex_t Adapter::_wifiMutex = PTHREAD_MUTEX_INITIALIZER;

Adapter::Adapter(AdapterAgent* agent, AdapterData* data, AdapterCapability* capability)
    : _agent(agent), _data(data), _capability(capability) {}

Adapter::~Adapter() {
  AdapterAgent::Delete(_agent);
  AdapterData::Delete(_data);
  AdapterCapability::Delete(_capability);
}

WIFI_TOPOLOGY Adapter::GetTopology() { return topology; }

Adapter::AdapterList& Adapter::GetList() { return list; }

Adapter* Adapter::Create(const std::string& ifname) {
  if (topology == WIFI_TOPOLOGY_ERROR) {
    topology = utils::ReadTopology();
    if (topology == WIFI_TOPOLOGY_ERROR) {
      VORN_LOG(LOG_ERR, "Failed to read topology from vorninfo.conf");
      return nullptr;
    }
  }
  AdapterData* data = AdapterData::Create(ifname);
  if (data == nullptr) {
    VORN_LOG(LOG_ERR, "Failed to create data(%s)", ifname.c_str());
    return nullptr;
  }
  AdapterCapability* capability = AdapterCapability::Create(ifname, data->GetConfig());
  if (capability == nullptr) {
    VORN_LOG(LOG_ERR, "Failed to create capability(%s)", ifname.c_str());
    AdapterData::Delete(data);
    return nullptr;
  }
  AdapterAgent* agent = AdapterAgent::Create(data->GetConfig());
  if (agent == nullptr) {
    VORN_LOG(LOG_ERR, "Failed to create agent(%s)", ifname.c_str());
    AdapterCapability::Delete(capability);
    AdapterData::Delete(data);
    return nullptr;
  }
  Adapter* adapter = new (std::nothrow) Adapter(agent, data, capability);
  if (adapter == nullptr) {
    AdapterAgent::Delete(agent);
    AdapterCapability::Delete(capability);
    AdapterData::Delete(data);
  }
  return adapter;
}

void Adapter::Delete(const Adapter* adapter) { delete adapter; }

Adapter::AdapterList::iterator Adapter::FindAdapter(const std::string& ifname) {
  for (AdapterList::iterator it = list.begin(); it != list.end(); ++it) {
    if (it->_data != nullptr && it->_data->GetConfig().interface == ifname) return it;
  }
  return list.end();
}

Adapter::AdapterList::iterator Adapter::FindAdapter(const MacAddress& bssid) {
  for (AdapterList::iterator it = list.begin(); it != list.end(); ++it) {
    if (it->_data != nullptr && it->_data->GetConfig().bssid.ToString() == bssid.ToString()) {
      return it;
    }
  }
  return list.end();
}

Adapter* Adapter::GetAdapter(const std::string& ifname) {
  AdapterList::iterator it = FindAdapter(ifname);
  return it == list.end() ? nullptr : &*it;
}

int Adapter::AddAdapter(const std::string& ifname) {
  if (FindAdapter(ifname) != list.end()) {
    VORN_LOG(LOG_ERR, "[%s] had been added", ifname.c_str());
    return -1;
  }
  Adapter* adapter = Create(ifname);
  if (adapter == nullptr) {
    VORN_LOG(LOG_ERR, "Failed to add adapter(%s)", ifname.c_str());
    return -1;
  }
  const AdapterConfig own = adapter->GetConfig();
  if (adapter->Apply(own) != 0) {
    VORN_LOG(LOG_ERR, "Failed to apply agent(%s) when created, skip it", ifname.c_str());
  }
  list.push_back(adapter);
  return 0;
}

int Adapter::RemoveAdapter(const std::string& ifname) {
  AdapterList::iterator it = FindAdapter(ifname);
  if (it == list.end()) {
    VORN_LOG(LOG_ERR, "Failed to find adapter(%s)", ifname.c_str());
    return -1;
  }
  it->Terminate();
  WifiLock lock;
  list.erase(it);
  return 0;
}

int Adapter::RefreshAdapterList() {
  List names(VLIBCSzListAlloc(kListSize));
  if (!names) {
    VORN_LOG(LOG_ERR, "Failed to allocate memory");
    return -1;
  }
  PVLIBSZLIST raw = names.release();
  int ret = EnumWlan(&raw);
  names.reset(raw);
  if (ret < 0) {
    VORN_LOG(LOG_ERR, "Failed to enum wlan");
    return -1;
  }
  const int count = VLIBCSzListCount(names.get());
  const char* const info = VLIBC_INFO_FILE;
  if (VLIBCINFOSetKeyValue("support_net_topology", count >= 1 ? "yes" : "no") < 0) {
    VORN_LOG(LOG_ERR, "Failed to set key [%s] in file [%s]", "support_net_topology", info);
    return -1;
  }
  if (VLIBCINFOSetKeyValue("has_wifi_dongle", GetDongleCount() >= 1 ? "yes" : "no") < 0) {
    VORN_LOG(LOG_ERR, "Failed to set key [%s] in file [%s]", "has_wifi_dongle", info);
    return -1;
  }
  int result = 0;
  for (int i = 0; i < count; ++i) {
    const char* name = VLIBCSzListGet(names.get(), i);
    if (name == nullptr || FindAdapter(name) != list.end()) continue;
    AddAdapter(name);
    result = 1;
  }
  if (list.size() != static_cast<std::size_t>(count)) {
    // After a removal the index still steps on: of two gone neighbours the second is removed by
    // the next refresh.
    for (std::size_t i = 0; i < list.size(); ++i) {
      const std::string ifname = list[i]._data != nullptr ? list[i]._data->GetConfig().interface
                                                           : std::string();
      if (ListHolds(names.get(), ifname)) continue;
      RemoveAdapter(ifname);
      result = 1;
    }
  }
  return result;
}

int Adapter::DeleteAdapterAll() {
  for (Adapter& adapter : list) {
    if (adapter._agent == nullptr || adapter._data == nullptr) continue;
    const AdapterConfig copy = adapter._data->GetConfig();
    if (adapter._agent->Disable(copy) < 0) {
      VORN_LOG(LOG_ERR, "Failed to disable agent (%s)", copy.interface.c_str());
    }
  }
  {
    WifiLock lock;
    for (Adapter& adapter : list) {
      AdapterAgent::Delete(adapter._agent);
      AdapterData::Delete(adapter._data);
      AdapterCapability::Delete(adapter._capability);
      adapter._agent = nullptr;
      adapter._data = nullptr;
      adapter._capability = nullptr;
    }
  }
  AdapterList old;
  old.swap(list);
  return 0;
}

int Adapter::AddAgentAll() {
  for (Adapter& adapter : list) {
    if (adapter._data == nullptr) continue;
    const AdapterConfig copy = adapter._data->GetConfig();
    AdapterAgent* agent = AdapterAgent::Create(copy);
    if (agent == nullptr) {
      VORN_LOG(LOG_ERR, "Failed to create new agent (%s)", copy.interface.c_str());
    }
    // Meant for adapters whose agents were deleted; one still held is released, not leaked.
    AdapterAgent::Delete(adapter._agent);
    adapter._agent = agent;
  }
  for (Adapter& adapter : list) {
    if (adapter._data == nullptr) continue;
    const AdapterConfig copy = adapter._data->GetConfig();
    if (adapter._agent == nullptr || adapter._agent->Recover(copy) < 0) {
      VORN_LOG(LOG_ERR, "Failed to enable new agent (%s)", copy.interface.c_str());
    }
  }
  return 0;
}

int Adapter::EnableAll() {
  if (list.empty()) return -1;
  for (Adapter& adapter : list) {
    if (adapter.HasNullMember()) {
      VORN_LOG(LOG_ERR, "Failed to initialize");
      continue;
    }
    AdapterConfig copy = adapter._data->GetConfig();
    copy.enabled = true;
    copy.clientenabled = true;
    if (adapter._agent->Enable(copy) < 0) VORN_LOG(LOG_ERR, "Failed to initialize");
  }
  return 0;
}

int Adapter::DisableAll() {
  if (list.empty()) return -1;
  for (Adapter& adapter : list) {
    if (adapter.HasNullMember()) {
      VORN_LOG(LOG_ERR, "Failed to terminate");
      continue;
    }
    AdapterConfig copy = adapter._data->GetConfig();
    copy.enabled = false;
    copy.clientenabled = false;
    if (adapter._agent->Disable(copy) < 0) VORN_LOG(LOG_ERR, "Failed to terminate");
  }
  return 0;
}

int Adapter::SwitchOnOff() {
  Adapter* pci = GetPCIAdapter();
  if (pci == nullptr) return 0;
  const WIFI_STATUS status = pci->GetStatus();
  if (status == WIFI_STATUS_ENABLED || status == WIFI_STATUS_ENABLING) return DisableAll();
  return EnableAll();
}

int Adapter::SwitchKernelModule(WIFI_TOPOLOGY oldTopology, WIFI_TOPOLOGY newTopology) {
  const std::string oldText = EnumMap<WIFI_TOPOLOGY>::EnumToString(oldTopology);
  const std::string newText = EnumMap<WIFI_TOPOLOGY>::EnumToString(newTopology);
  if (VLIBCExec(kWifiUtil, "unload-driver", oldText.c_str(), nullptr, nullptr) < 0) {
    VORN_LOG(LOG_ERR, "Error on cmd [%s]",
             (std::string(kWifiUtil) + " unload-driver " + oldText).c_str());
    return -1;
  }
  if (VLIBCExec(kWifiUtil, "load-driver", newText.c_str(), nullptr, nullptr) < 0) {
    VORN_LOG(LOG_ERR, "Error on cmd [%s]",
             (std::string(kWifiUtil) + " load-driver " + newText).c_str());
    return -1;
  }
  // The new driver needs a moment before its interfaces exist.
  sleep(3);
  return 0;
}

int Adapter::GetDongleCount() {
  List names(VLIBCSzListAlloc(kListSize));
  if (!names) {
    VORN_LOG(LOG_ERR, "Failed to allocate memory");
    return -1;
  }
  PVLIBSZLIST raw = names.release();
  int count = VLIBCFileEnumDir("/tmp/", "wireless.info", &raw, VLIBC_ENUM_DIR_ANY);
  names.reset(raw);
  if (count < 0) {
    VORN_LOG(LOG_ERR, "Failed to enum all files under /tmp/wireless.info");
    return -1;
  }
  return count;
}

int Adapter::GetEnabledAdapterCount() {
  int count = 0;
  for (const Adapter& adapter : list) {
    const WIFI_STATUS status = adapter.GetStatus();
    if (status == WIFI_STATUS_ENABLED || status == WIFI_STATUS_ENABLING) ++count;
  }
  return count;
}

Adapter* Adapter::GetPCIAdapter() {
  Adapter* found = nullptr;
  for (Adapter& adapter : list) {
    if (adapter._data != nullptr && utils::IsSkyBuiltInWlan(adapter._data->GetConfig().interface)) {
      found = &adapter;
    }
  }
  return found;
}

MacAddress Adapter::GetAddressByIFName(const std::string& ifname) {
  const std::string path = std::string(kNetDir) + ifname + "/address";
  std::ifstream in(path);
  std::string line;
  if (!in || !std::getline(in, line)) {
    VORN_LOG(LOG_ERR, "Failed to open file [%s]", path.c_str());
    return MacAddress();
  }
  return MacAddress(line);
}

int Adapter::Initialize() {
  if (HasNullMember()) return -1;
  return _agent->Recover(_data->GetConfig());
}

int Adapter::Terminate() {
  if (HasNullMember()) return -1;
  return _agent->Disable(_data->GetConfig());
}

int Adapter::Apply(const AdapterConfig& config) {
  WifiLock lock;
  if (HasNullMember()) {
    VORN_LOG(LOG_ERR, "Bad member(%p, %p, %p)", static_cast<void*>(_agent),
             static_cast<void*>(_data), static_cast<void*>(_capability));
    return -1;
  }
  if (_capability->Verify(config) < 0) {
    VORN_LOG(LOG_ERR, "Bad config");
    return -1;
  }
  if (_data->SetConfig(config) < 0) {
    VORN_LOG(LOG_ERR, "Failed to set config");
    return -1;
  }
  if (_data->Write() < 0) {
    VORN_LOG(LOG_ERR, "Failed to write config");
    return -1;
  }
  if (_agent->Reload(_data->GetConfig(), _data->GetReloadStatus()) < 0) {
    VORN_LOG(LOG_ERR, "Failed to apply new config");
    return -1;
  }
  if (_data->ResetReloadStatus() < 0) {
    VORN_LOG(LOG_ERR, "Failed to rest reload status");
    return -1;
  }
  return 0;
}

int Adapter::ExecSchedule() {
  if (HasNullMember()) {
    VORN_LOG(LOG_ERR, "Bad member(%p, %p, %p)", static_cast<void*>(_agent),
             static_cast<void*>(_data), static_cast<void*>(_capability));
    return -1;
  }
  if (topology != WIFI_TOPOLOGY_BRIDGE && topology != WIFI_TOPOLOGY_ROUTER) {
    VORN_LOG(LOG_ERR, "Schedule function should only execute in router or bridge mode");
    return -1;
  }
  AdapterConfig copy = _data->GetConfig();
  if (!copy.schedule_enabled && !copy.guest_schedule_enabled) {
    VORN_LOG(LOG_ERR, "Adapter [%s]'s schedule is not enabled, but still executed",
             copy.interface.c_str());
    return -1;
  }
  const time_t now = time(nullptr);
  struct tm local;
  if (localtime_r(&now, &local) == nullptr) {
    VORN_LOG(LOG_ERR, "Failed to get local time");
    return -1;
  }
  const unsigned cell = static_cast<unsigned>(local.tm_wday * 24 + local.tm_hour);
  bool changed = false;
  if (copy.schedule_enabled && copy.enabled != copy.schedule[cell]) {
    copy.enabled = copy.schedule[cell];
    changed = true;
  }
  if (copy.guest_schedule_enabled && copy.guest_enabled != copy.guest_schedule[cell]) {
    copy.guest_enabled = copy.guest_schedule[cell];
    changed = true;
  }
  if (!changed) return 0;
  if (Apply(copy) != 0) {
    VORN_LOG(LOG_ERR, "Failed to apply config for schedule");
    return -1;
  }
  return 0;
}

WIFI_STATUS Adapter::GetStatus() const {
  if (HasNullMember()) return WIFI_STATUS_ERROR;
  return _agent->GetStatus(_data->GetConfig());
}

const AdapterConfig& Adapter::GetConfig() const {
  static const AdapterConfig empty;
  return _data != nullptr ? _data->GetConfig() : empty;
}

const AdapterCapability& Adapter::GetCapability() const { return *_capability; }

bool Adapter::IsTopology(WIFI_TOPOLOGY t) const { return topology == t; }

bool Adapter::HasNullMember() const {
  return _agent == nullptr || _data == nullptr || _capability == nullptr;
}

int Adapter::ScanNetworks(std::vector<AdapterConfig::StationInfo>& stations) {
  if (_agent == nullptr || _data == nullptr) {
    VORN_LOG(LOG_ERR, "No agent");
    return -1;
  }
  return _agent->ScanNetworks(_data->GetConfig(), stations);
}

int Adapter::LoadStationConnData(std::vector<utils::ConnectionInfo>& out) {
  if (_agent == nullptr) {
    VORN_LOG(LOG_ERR, "No agent");
    return -1;
  }
  return _agent->LoadStationConnData(out);
}

int Adapter::EnableWPSWithPBC() {
  if (_agent == nullptr) {
    VORN_LOG(LOG_ERR, "No agent");
    return -1;
  }
  return _agent->EnableWPSWithPBC();
}

int Adapter::EnableWPSWithPinCode(const std::string& pin) {
  if (_agent == nullptr) {
    VORN_LOG(LOG_ERR, "No agent");
    return -1;
  }
  return _agent->EnableWPSWithPinCode(pin);
}

bool Adapter::SetCountryCodeImpl(const std::string& code) {
  if (_agent == nullptr) {
    VORN_LOG(LOG_ERR, "No agent");
    return false;
  }
  return _agent->SetCountryCodeImpl(code);
}

int Adapter::SwitchTopology(WIFI_TOPOLOGY) { return 0; }

}  // namespace wifi
}  // namespace vornwireless
