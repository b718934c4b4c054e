// The route module: the gateway lists of both families, their files, and the choice of the
// default route. The order of a list is its priority: index 0 is the most wanted gateway.
#include "vornwireless/network/route/route_module.h"

#include <fcntl.h>
#include <net/if.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <climits>
#include <exception>

#include "vornplatform/file.h"
#include "vornplatform/gateway.h"
#include "vornplatform/log.h"
#include "vornplatform/netif_link.h"
#include "vornplatform/proc.h"
#include "vornplatform/route_actions.h"
#include "vornplatform/szhash.h"
#include "vornwireless/network/route/policy_route.h"
#include "vornwireless/network/utils.h"
#include "vornwireless/utils/config.h"
#include "vornwireless/utils/file.h"
#include "vornwireless/utils/get_default_route.h"

namespace vornnetwork {
namespace network {
namespace module {

using vornwireless::utils::ConfigSection;
using vornwireless::utils::IPAddress;

namespace {

const char kTypeV4[] = "GTYPE_V4";
const char kTypeV6[] = "GTYPE_V6";
const char kTypeAll[] = "ALL";
const char kNotGiven[] = "NULL";
const char kIpCommand[] = "/sbin/ip";
const int kExeclFlags = 187;
const char kInfoFile[] = "/etc/vorninfo.conf";
const char kConfigDir[] = "/etc/iproute2/config";

enum class ResolverWrite { kDone, kCannotPlace, kCannotWrite };

// Writes content to a temporary file in path's directory (mode 0644: the resolver reads it),
// syncs it and renames it over path. kCannotPlace when no temporary file can be made there or
// the rename fails (e.g. path is a directory), kCannotWrite when writing or syncing fails. The
// temporary file never stays behind.
ResolverWrite ReplaceResolverFile(char const* path, std::string const& content) {
  std::string tmp = std::string(path) + ".tmp.XXXXXX";
  int fd = mkostemp(&tmp[0], O_CLOEXEC);
  if (fd < 0) return ResolverWrite::kCannotPlace;
  bool ok = fchmod(fd, 0644) == 0;
  std::size_t done = 0;
  while (ok && done < content.size()) {
    ssize_t n = write(fd, content.data() + done, content.size() - done);
    if (n < 0 && errno == EINTR) continue;
    if (n <= 0) {
      ok = false;
      break;
    }
    done += static_cast<std::size_t>(n);
  }
  ok = fsync(fd) == 0 && ok;
  ok = close(fd) == 0 && ok;
  if (!ok) {
    unlink(tmp.c_str());
    return ResolverWrite::kCannotWrite;
  }
  if (rename(tmp.c_str(), path) != 0) {
    unlink(tmp.c_str());
    return ResolverWrite::kCannotPlace;
  }
  return ResolverWrite::kDone;
}

// RAII for the platform's string list.
struct SzList {
  explicit SzList(int capacity) : list(VLIBCSzListAlloc(capacity)) {}
  ~SzList() { VLIBCSzListFree(list); }
  SzList(SzList const&) = delete;
  SzList& operator=(SzList const&) = delete;
  PVLIBSZLIST list;
};

// The request's "type" text; "" when it is no string.
std::string TypeText(Json::Value const& request) {
  Json::Value const& type = request["type"];
  return type.isString() ? type.asString() : std::string();
}

// A member that is present and not "NULL" (only strings get here, see the checks below).
bool Given(Json::Value const& request, char const* key) {
  Json::Value const& value = request[key];
  return value.isString() && value.asString() != kNotGiven;
}

// Interface names as the kernel reports them, aliases ("eth0:1") included; only what would break
// a section file is refused: an empty name, a line break or other control character, '[', ']'
// and '='.
bool ValidIfname(std::string const& name) {
  if (name.empty()) return false;
  for (unsigned char c : name) {
    if (c < ' ' || c == 0x7f || c == '[' || c == ']' || c == '=') return false;
  }
  return true;
}

// Reads a member that must be a valid interface name.
bool ReadIfname(Json::Value const& request, char const* key, std::string& name) {
  Json::Value const& value = request[key];
  if (!value.isString()) {
    VORN_LOG(LOG_ERR, "Invalid member [%s] in request", key);
    return false;
  }
  name = value.asString();
  if (!ValidIfname(name)) {
    VORN_LOG(LOG_ERR, "Invalid interface name [%.64s]", name.c_str());
    return false;
  }
  return true;
}

// An optional text member: absent, null or a string.
bool OptionalString(Json::Value const& request, char const* key) {
  Json::Value const& value = request[key];
  if (value.isNull() || value.isString()) return true;
  VORN_LOG(LOG_ERR, "Invalid member [%s] in request", key);
  return false;
}

// An optional address member: absent, null or a string. A text that is no address is stored as
// the empty address.
bool OptionalAddress(Json::Value const& request, char const* key) {
  return OptionalString(request, key);
}

// An optional class: absent, null, or a text that fits on one line of the priority file.
bool OptionalClass(Json::Value const& request) {
  if (!OptionalString(request, "class")) return false;
  if (!Given(request, "class")) return true;
  std::string const text = request["class"].asString();
  bool ok = true;
  for (unsigned char c : text) ok = ok && c >= ' ' && c != 0x7f;
  if (!ok) VORN_LOG(LOG_ERR, "Invalid class [%.64s]", text.c_str());
  return ok;
}

// A member that must be a JSON bool.
bool ReadBool(Json::Value const& request, char const* key, bool& out) {
  Json::Value const& value = request[key];
  if (!value.isBool()) {
    VORN_LOG(LOG_ERR, "Invalid member [%s] in request", key);
    return false;
  }
  out = value.asBool();
  return true;
}

// "priority" must be an integral number; an absent one reads as 0. Numbers beyond int append
// like any other value outside the list.
bool ReadPriority(Json::Value const& request, int& priority) {
  Json::Value const& value = request["priority"];
  if (value.isNull()) {
    priority = 0;
    return true;
  }
  if (!value.isIntegral()) {
    VORN_LOG(LOG_ERR, "Invalid member [%s] in request", "priority");
    return false;
  }
  if (value.isInt()) {
    priority = value.asInt();
  } else if (value.isInt64() && value.asInt64() < 0) {
    priority = INT_MIN;
  } else {
    priority = INT_MAX;
  }
  return true;
}

bool StartsWith(std::string const& text, char const* prefix) {
  return text.compare(0, std::char_traits<char>::length(prefix), prefix) == 0;
}

// Entries that may carry the default route: not enslaved, and an "ethernet" that is not a
// wlan interface only when ethtool sees its link.
bool IsCandidate(GatewayInfo const& info) {
  if (info._slave) return false;
  if (info._class == "ethernet" && !StartsWith(info._ifname, "wlan") &&
      !IsEthernetLinkDetected(info._ifname)) {
    return false;
  }
  return true;
}

void MoveToFront(std::vector<GatewayInfo>& list, size_t index) {
  std::rotate(list.begin(), list.begin() + index, list.begin() + index + 1);
}

char const* PriorityFile(GATEWAY_TYPE type) {
  return type == GTYPE_V4 ? VORN_GATEWAY_V4_PRIORITY_FILE : VORN_GATEWAY_V6_PRIORITY_FILE;
}

}  // namespace

RouteModule::RouteModule() : BaseModule(MODULE_ROUTE) {}

RouteModule::~RouteModule() {}

BaseModule* RouteModule::Create() { return new RouteModule(); }

int RouteModule::ProcessRequest(Json::Value const& request, Json::Value& response) {
  _routeMutex.Lock();
  try {
    Dispatch(request, response);
  } catch (std::exception const& e) {
    VORN_LOG(LOG_ERR, "Bad request: %s", e.what());
  } catch (...) {
    VORN_LOG(LOG_ERR, "Bad request: unknown exception");
  }
  _routeMutex.Unlock();
  return 0;
}

int RouteModule::Dispatch(Json::Value const& request, Json::Value& response) {
  if (!request.isObject()) {
    VORN_LOG(LOG_ERR, "Bad request: a JSON object is expected");
    return -1;
  }
  Json::Value const& methodValue = request["method"];
  if (!methodValue.isString()) return 0;
  std::string const method = methodValue.asString();
  if (method == "GET_GATEWAY_LIST_DATA") return GetGatewayListData(request, response);
  if (method == "ADD_GATEWAY_DATA") return AddGatewayInfo(request);
  if (method == "DEL_GATEWAY_DATA") return DelGatewayInfo(request);
  if (method == "GET_GATEWAY_DATA_BY_INTERFACE") {
    return GetGatewayDataByInterface(request, response);
  }
  if (method == "SET_SLAVE_DATA") return SetSlaveForGatewayInfo(request);
  if (method == "COPY_GATEWAY_DATA") return CopyGatewayData(request);
  if (method == "REFRESH_GATEWAY") return RefreshDefaultGateway(request);
  return 0;
}

int RouteModule::InitialModule() {
  try {
    ReadGatewayListFromFile(GTYPE_V4);
    ReadGatewayListFromFile(GTYPE_V6);
    PolicyRoute policyRoute;
    policyRoute.DisableTable(IPTYPE_V4, "static");
    policyRoute.DisableTable(IPTYPE_V6, "static");
    policyRoute.EnableTable(IPTYPE_V4, "static", "all");
    policyRoute.EnableTable(IPTYPE_V6, "static", "all");
  } catch (std::exception const& e) {
    VORN_LOG(LOG_ERR, "Failed to initialize route module: %s", e.what());
  }
  return 0;
}

int RouteModule::TerminateModule() { return 0; }

int RouteModule::StartModule() { return 0; }

std::vector<GatewayInfo>* RouteModule::PickList(Json::Value const& request,
                                                char const* unknownText, GATEWAY_TYPE* type) {
  std::string const text = TypeText(request);
  GATEWAY_TYPE picked;
  if (text == kTypeV4) {
    picked = GTYPE_V4;
  } else if (text == kTypeV6) {
    picked = GTYPE_V6;
  } else {
    VORN_LOG(LOG_ERR, "%s", unknownText);
    return nullptr;
  }
  if (type != nullptr) *type = picked;
  return picked == GTYPE_V4 ? &_gatewayListV4 : &_gatewayListV6;
}

std::vector<GatewayInfo> RouteModule::GetGatewayList(GATEWAY_TYPE type) {
  _routeMutex.Lock();
  std::vector<GatewayInfo> copy = type == GTYPE_V6 ? _gatewayListV6 : _gatewayListV4;
  _routeMutex.Unlock();
  return copy;
}

int RouteModule::ReadGatewayListFromFile(GATEWAY_TYPE type) {
  std::vector<GatewayInfo>* target;
  if (type == GTYPE_V4) {
    target = &_gatewayListV4;
  } else if (type == GTYPE_V6) {
    target = &_gatewayListV6;
  } else {
    VORN_LOG(LOG_ERR, "Unknown type to read config");
    return -1;
  }
  char const* path = PriorityFile(type);
  if (VLIBCFileExist(path) != 1) return 0;

  ConfigSection config(path);
  if (config.Read() != 0) {
    VORN_LOG(LOG_ERR, "Failed to read config [%s]", path);
    return -1;
  }
  std::vector<GatewayInfo> list;
  // The section map walks in string order: "0", "1", "10", "11", "2", ...
  for (auto const& section : config.GetKeyValues()) {
    std::map<std::string, std::string> keys = section.second;
    GatewayInfo info;
    info._ifname = keys["ifname"];
    info._gateway = keys["gateway"];
    info._dns = keys["dns"];
    info._slave = keys["slave"] == "yes";
    info._class = keys["class"];
    if (VORNNetIfIsLink(info._ifname.c_str()) < 1) {
      VORN_LOG(LOG_INFO, "Interface [%s] is not up, skip it", info._ifname.c_str());
      continue;
    }
    list.push_back(info);
  }
  target->swap(list);
  return 0;
}

int RouteModule::WriteGatewayListToFile(GATEWAY_TYPE type) {
  std::vector<GatewayInfo> const* source;
  if (type == GTYPE_V4) {
    source = &_gatewayListV4;
  } else if (type == GTYPE_V6) {
    source = &_gatewayListV6;
  } else {
    VORN_LOG(LOG_ERR, "Unknown type to write config");
    return -1;
  }
  char const* path = PriorityFile(type);
  ConfigSection config(path);
  for (size_t i = 0; i < source->size(); ++i) {
    GatewayInfo const& info = (*source)[i];
    std::string const section = std::to_string(i);
    config.AddKeyValue(section, "ifname", info._ifname);
    config.AddKeyValue(section, "gateway", info._gateway.ToString());
    config.AddKeyValue(section, "dns", info._dns.ToString());
    config.AddKeyValue(section, "slave", info._slave);
    config.AddKeyValue(section, "class", info._class);
  }
  if (config.Write() != 0) {
    VORN_LOG(LOG_ERR, "Failed to set file[%s]", path);
    return -1;
  }
  return 0;
}

int RouteModule::WriteGatewayToDatabase(GATEWAY_TYPE type) {
  std::vector<GatewayInfo> const* source;
  char const* gatewayKey;
  char const* dnsKey;
  if (type == GTYPE_V4) {
    source = &_gatewayListV4;
    gatewayKey = "gateway";
    dnsKey = "dns";
  } else if (type == GTYPE_V6) {
    source = &_gatewayListV6;
    gatewayKey = "gateway_v6";
    dnsKey = "dns_v6";
  } else {
    VORN_LOG(LOG_ERR, "Unknown type to write config");
    return -1;
  }
  char const* path = VORN_GATEWAY_DATABASE_FILE;
  if (VLIBCFileExist(path) != 1) {
    vornwireless::utils::CheckAndMakeDir(kConfigDir, 0755);
    VLIBCExec("/bin/touch", path, nullptr, nullptr, nullptr);
  }
  ConfigSection config(path);
  if (config.Read() != 0) {
    VORN_LOG(LOG_ERR, "Failed to read config [%s]", path);
    return -1;
  }
  for (GatewayInfo const& info : *source) {
    config.AddKeyValue(info._ifname, gatewayKey, info._gateway.ToString());
    config.AddKeyValue(info._ifname, dnsKey, info._dns.ToString());
  }
  if (config.Write() != 0) {
    VORN_LOG(LOG_ERR, "Failed to set file[%s]", path);
    return -1;
  }
  return 0;
}

int RouteModule::WriteDnsFile(GATEWAY_TYPE type) {
  std::vector<GatewayInfo> const* source;
  char const* path;
  if (type == GTYPE_V4) {
    source = &_gatewayListV4;
    path = VORN_RESOLV4_FILE;
  } else if (type == GTYPE_V6) {
    source = &_gatewayListV6;
    path = VORN_RESOLV6_FILE;
  } else {
    VORN_LOG(LOG_ERR, "Unknown type to write config");
    return -1;
  }
  std::string content;
  for (GatewayInfo const& info : *source) {
    if (!info._dns.IsEmpty()) content += "nameserver " + info._dns.ToString() + "\n";
  }
  // Replaced as a whole (a temporary file beside it, fsync, rename): the resolver update and any
  // other reader see the old list or the new one, never a cut one, even if we die meanwhile.
  switch (ReplaceResolverFile(path, content)) {
    case ResolverWrite::kCannotPlace:
      VORN_LOG(LOG_ERR, "Failed to open file[%s]", path);
      return -1;
    case ResolverWrite::kCannotWrite:
      VORN_LOG(LOG_ERR, "Failed to write file[%s]", path);
      return -1;
    case ResolverWrite::kDone:
      break;
  }
  if (VLIBCFileCheckKeyValue(kInfoFile, "dns_mode", "auto", 1) != 0) {
    vornnetsdk::sdk_s::VORNNetDNSUpdate_S();
  }
  return 0;
}

int RouteModule::IsDatabaseChanged(std::string const& section, std::string const& key,
                                   std::string const& value) {
  char const* path = VORN_GATEWAY_DATABASE_FILE;
  if (VLIBCFileExist(path) != 1) return 1;
  ConfigSection config(path);
  if (config.Read() != 0) {
    VORN_LOG(LOG_ERR, "Failed to read config [%s]", path);
    return -1;
  }
  if (!config.Find(section)) return 1;
  return config.GetKeyValue(section, key) != value ? 1 : 0;
}

// Whether the request's `member` ("gateway" or "dns") differs from the database's key of the
// request's family: 1 changed, 0 not given ("NULL" or absent) or equal, -1 on an unknown type.
int RouteModule::IsConfigChanged(Json::Value const& request, char const* member,
                                 char const* keyV4, char const* keyV6) {
  std::string const type = TypeText(request);
  char const* key;
  if (type == kTypeV4) {
    key = keyV4;
  } else if (type == kTypeV6) {
    key = keyV6;
  } else {
    VORN_LOG(LOG_ERR, "Unknown type");
    return -1;
  }
  if (!Given(request, member)) return 0;
  Json::Value const& ifname = request["ifname"];
  if (!ifname.isString()) return -1;
  // The stored form: a text that is no address is the empty address.
  return IsDatabaseChanged(ifname.asString(), key, IPAddress(request[member].asString()).ToString());
}

int RouteModule::IsGatewayConfigChanged(Json::Value const& request) {
  return IsConfigChanged(request, "gateway", "gateway", "gateway_v6");
}

int RouteModule::IsDnsConfigChanged(Json::Value const& request) {
  return IsConfigChanged(request, "dns", "dns", "dns_v6");
}

int RouteModule::AddGatewayInfo(Json::Value const& request) {
  int priority = 0;
  if (!ReadPriority(request, priority)) return -1;
  GATEWAY_TYPE type;
  std::vector<GatewayInfo>* list = PickList(request, "Unknown type to add info", &type);
  if (list == nullptr) return -1;
  char const* family = type == GTYPE_V4 ? "ipv4" : "ipv6";
  std::string ifname;
  if (!ReadIfname(request, "ifname", ifname)) return -1;
  if (!OptionalAddress(request, "gateway") || !OptionalAddress(request, "dns") ||
      !OptionalClass(request)) {
    return -1;
  }

  SzList dnsList(4);
  if (dnsList.list == nullptr) {
    VORN_LOG(LOG_ERR, "Fail to allocate memory");
    return -1;
  }
  // Compared with the database, not with the list.
  bool const gatewayChanged = IsGatewayConfigChanged(request) > 0;
  bool const dnsChanged = IsDnsConfigChanged(request) > 0;

  GatewayInfo info;
  info._ifname = ifname;
  info._class = "unknown";
  info._slave = false;
  std::string oldGateway;
  int index = 0;
  for (auto it = list->begin(); it != list->end(); ++it, ++index) {
    if (it->_ifname == ifname) {
      info = *it;
      oldGateway = it->_gateway.ToString();
      list->erase(it);
      break;
    }
  }

  if (Given(request, "gateway")) info._gateway = request["gateway"].asString();
  bool writeDns = false;
  if (Given(request, "dns")) {
    std::string const dns = IPAddress(request["dns"].asString()).ToString();
    writeDns = dns != info._dns.ToString();
    info._dns = dns;
  }
  if (Given(request, "class")) info._class = request["class"].asString();
  // A new place changes the order of the resolver lines.
  if (index != priority && priority != -2) writeDns = true;

  std::string const newGateway = info._gateway.ToString();
  if (gatewayChanged) {
    VORNNetGatewayConfigChangeHook(4, family, ifname.c_str(), oldGateway.c_str(),
                                   newGateway.c_str());
  }
  if (dnsChanged) {
    VLIBCSzListPush(&dnsList.list, info._dns.ToCString());
    VORNNetDnsConfigChangeHook(4, ifname.c_str(), dnsList.list);
  }

  size_t position;
  if (priority == -2) {
    position = static_cast<size_t>(index);
  } else if (static_cast<unsigned int>(priority) <= list->size()) {
    position = static_cast<size_t>(priority);
  } else {
    position = list->size();
  }
  list->insert(list->begin() + static_cast<std::ptrdiff_t>(position), info);

  if (WriteGatewayListToFile(type) != 0) return -1;
  if (writeDns && WriteDnsFile(type) != 0) return -1;
  if (WriteGatewayToDatabase(type) != 0) return -1;
  RefreshDefaultGateway(request);

  if (gatewayChanged) {
    VORNNetGatewayConfigChangeHook(5, family, ifname.c_str(), oldGateway.c_str(),
                                   newGateway.c_str());
  }
  if (dnsChanged) VORNNetDnsConfigChangeHook(5, ifname.c_str(), dnsList.list);
  return 0;
}

int RouteModule::DelGatewayInfo(Json::Value const& request) {
  GATEWAY_TYPE type;
  std::vector<GatewayInfo>* list = PickList(request, "Unknown type to delete info", &type);
  if (list == nullptr) return -1;
  std::string ifname;
  if (!ReadIfname(request, "ifname", ifname)) return -1;

  bool writeDns = false;
  for (auto it = list->begin(); it != list->end(); ++it) {
    if (it->_ifname == ifname) {
      writeDns = !it->_dns.IsEmpty();
      list->erase(it);
      break;
    }
  }
  if (WriteGatewayListToFile(type) != 0) return -1;
  if (writeDns && WriteDnsFile(type) != 0) return -1;
  RefreshDefaultGateway(request);
  return 0;
}

int RouteModule::SetSlaveForGatewayInfo(Json::Value const& request) {
  GATEWAY_TYPE type;
  std::vector<GatewayInfo>* list = PickList(request, "Unknown type to delete info", &type);
  if (list == nullptr) return -1;
  std::string ifname;
  if (!ReadIfname(request, "ifname", ifname)) return -1;
  bool slave = false;
  if (!ReadBool(request, "slave", slave)) return -1;

  auto it = std::find_if(list->begin(), list->end(),
                         [&](GatewayInfo const& info) { return info._ifname == ifname; });
  if (it == list->end()) return 0;
  it->_slave = slave;
  if (slave) {
    // A slave goes to the end of the list; a cleared flag leaves the entry where it is.
    GatewayInfo const moved = *it;
    list->erase(it);
    list->push_back(moved);
  }
  if (WriteGatewayListToFile(type) != 0) return -1;
  if (WriteDnsFile(type) != 0) return -1;
  return 0;
}

int RouteModule::CopyGatewayData(Json::Value const& request) {
  GATEWAY_TYPE type;
  std::vector<GatewayInfo>* list = PickList(request, "Unknown type to get data", &type);
  if (list == nullptr) return -1;
  std::string source;
  std::string destination;
  bool sourceDelete = false;
  if (!ReadIfname(request, "interface_source", source) ||
      !ReadIfname(request, "interface_destination", destination) ||
      !ReadBool(request, "interface_source_delete", sourceDelete)) {
    return -1;
  }
  if (source == destination) {
    // Erasing the destination first would lose the entry.
    VORN_LOG(LOG_ERR, "Source and destination are the same interface [%s]", source.c_str());
    return -1;
  }

  for (auto it = list->begin(); it != list->end(); ++it) {
    if (it->_ifname == destination) {
      list->erase(it);
      break;
    }
  }
  size_t index = 0;
  for (; index < list->size(); ++index) {
    if ((*list)[index]._ifname == source) break;
  }
  if (index < list->size()) {
    GatewayInfo copy = (*list)[index];
    copy._ifname = destination;
    if (sourceDelete) list->erase(list->begin() + static_cast<std::ptrdiff_t>(index));
    list->insert(list->begin() + static_cast<std::ptrdiff_t>(index), copy);
  }
  if (WriteGatewayListToFile(type) != 0) return -1;
  if (WriteDnsFile(type) != 0) return -1;
  if (WriteGatewayToDatabase(type) != 0) return -1;
  return 0;
}

int RouteModule::GetGatewayListData(Json::Value const& request, Json::Value& response) {
  std::vector<GatewayInfo>* list = PickList(request, "Unknown type to get data", nullptr);
  if (list == nullptr) return -1;
  std::string heartbeat;
  if (VORNHAIsRunning() != 0) {
    char name[16] = "";
    if (VORNHAGetHeartbeatIF(name, sizeof name) < 0) {
      VORN_LOG(LOG_ERR, "Failed to get heartbeat interface.");
      name[0] = '\0';
    }
    heartbeat = name;
  }
  if (!response.isArray()) response = Json::Value(Json::arrayValue);
  for (size_t i = 0; i < list->size(); ++i) {
    GatewayInfo const& info = (*list)[i];
    // The heartbeat interface is left out; its index still counts.
    if (!heartbeat.empty() && info._ifname == heartbeat) continue;
    Json::Value entry(Json::objectValue);
    entry["priority"] = static_cast<int>(i);
    entry["ifname"] = info._ifname;
    entry["gateway"] = info._gateway.ToString();
    entry["dns"] = info._dns.ToString();
    entry["slave"] = info._slave;
    entry["class"] = info._class;
    response.append(entry);
  }
  return 0;
}

int RouteModule::GetGatewayDataByInterface(Json::Value const& request, Json::Value& response) {
  std::vector<GatewayInfo>* list = PickList(request, "Unknown type to get data", nullptr);
  if (list == nullptr) return -1;
  Json::Value const& ifnameValue = request["ifname"];
  if (!ifnameValue.isString()) {
    VORN_LOG(LOG_ERR, "Invalid member [%s] in request", "ifname");
    return -1;
  }
  std::string const ifname = ifnameValue.asString();
  if (!response.isObject()) response = Json::Value(Json::objectValue);
  response["priority"] = -1;
  response["gateway"] = "";
  response["dns"] = "";
  response["slave"] = false;
  response["class"] = "unknown";
  response["exist"] = false;
  for (size_t i = 0; i < list->size(); ++i) {
    GatewayInfo const& info = (*list)[i];
    if (info._ifname != ifname) continue;
    response["priority"] = static_cast<int>(i);
    response["gateway"] = info._gateway.ToString();
    response["dns"] = info._dns.ToString();
    response["slave"] = info._slave;
    response["class"] = info._class;
    response["exist"] = true;
    break;
  }
  return 0;
}

int RouteModule::RefreshDefaultGateway(Json::Value const& request) {
  std::string const type = TypeText(request);
  if (type == kTypeV4) return RefreshDefaultGatewayV4();
  if (type == kTypeV6) return RefreshDefaultGatewayV6();
  if (type == kTypeAll) {
    int const result = RefreshDefaultGatewayV4();
    if (result < 0) return result;
    return RefreshDefaultGatewayV6();
  }
  VORN_LOG(LOG_ERR, "Unknown type to add info");
  return -1;
}

int RouteModule::RefreshDefaultGatewayV4() {
  if (VORNNetDefaultGatewaySet(nullptr) < 0) {
    VORN_LOG(LOG_ERR, "Failed to delete default gateway");
    return -1;
  }
  char saved[20] = "";
  if (VORNNetDefaultGatewayGet(saved, sizeof saved) < 0) {
    VORN_LOG(LOG_ERR, "Get system gateway failed");
    return -1;
  }
  for (size_t i = 0; i < _gatewayListV4.size(); ++i) {
    GatewayInfo const& info = _gatewayListV4[i];
    if (!IsCandidate(info)) continue;
    char address[1024] = "";
    VORNILnxGetIP(info._ifname.c_str(), address, sizeof address);
    if (VLIBCExecl(kIpCommand, kExeclFlags, "route", "add", "default", "via",
                   info._gateway.ToCString(), "dev", info._ifname.c_str(), "src", address,
                   static_cast<char const*>(nullptr)) == 0) {
      // The winner stays first, even when a better-ranked interface comes back.
      MoveToFront(_gatewayListV4, i);
      return 0;
    }
  }
  VORNNetDefaultGatewaySet(saved);
  return 0;
}

int RouteModule::RefreshDefaultGatewayV6() {
  if (_gatewayListV6.empty()) return 0;
  int const routes = vornwireless::utils::GetNumDefaultRoutes<AF_INET6>();
  for (int i = 0; i < routes; ++i) {
    if (VLIBCExecl(kIpCommand, kExeclFlags, "-6", "route", "delete", "default",
                   static_cast<char const*>(nullptr)) != 0) {
      VORN_LOG(LOG_INFO, "delete default route failed");
    }
  }
  for (size_t i = 0; i < _gatewayListV6.size(); ++i) {
    GatewayInfo const& info = _gatewayListV6[i];
    if (!IsCandidate(info)) continue;
    int result;
    if (info._gateway.ToString() == "::") {
      result = VLIBCExecl(kIpCommand, kExeclFlags, "-6", "route", "add", "default", "dev",
                          info._ifname.c_str(), static_cast<char const*>(nullptr));
    } else {
      result = VLIBCExecl(kIpCommand, kExeclFlags, "-6", "route", "add", "default", "via",
                          info._gateway.ToCString(), "dev", info._ifname.c_str(),
                          static_cast<char const*>(nullptr));
    }
    if (result == 0) {
      MoveToFront(_gatewayListV6, i);
      break;
    }
  }
  return 0;
}

}  // namespace module
}  // namespace network
}  // namespace vornnetwork
