// The record of one WAN's IPv6 router mode and its sectioned file.
#include "vornwireless/ipv6router/router6_attr.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "vornplatform/file.h"
#include "vornplatform/ipv6.h"
#include "vornplatform/log.h"
#include "vornplatform/szhash.h"
#include "vornwireless/utils/dbus_client.h"

namespace vorn {
namespace network {
namespace ipv6 {
namespace router {

char const kRouter6ConfigDir[] = "/etc/sysconfig/networking";

namespace {

const char kConfigPrefix[] = "/etc/sysconfig/networking/ipv6-";
const char kSectionFormat[] = "\t%s=%s\n";
const int kHashCapacity = 16;

// Frees the hash on every path.
struct HashHolder {
  PVLIBSZHASH hash;
  explicit HashHolder(PVLIBSZHASH h) : hash(h) {}
  ~HashHolder() { VLIBCSzHashFree(hash); }
  HashHolder(HashHolder const&) = delete;
  HashHolder& operator=(HashHolder const&) = delete;
};

bool Fill(PVLIBSZHASH hash, char const* key, std::string const& value) {
  return VLIBCSzHashSetValue(hash, key, value.c_str()) >= 0;
}

// The value of key in hash; false (logged) when it is missing.
bool Get(PVLIBSZHASH hash, char const* key, std::string& value) {
  const char* found = VLIBCSzHashGetValue(hash, key);
  if (!found) {
    VORN_LOG(LOG_ERR, "Failed to get config section");
    return false;
  }
  value = found;
  return true;
}

}  // namespace

Router6Attr::Router6Attr() : type("off"), is_default_gateway(false) {}

Router6Attr::Router6Attr(std::string const& wanName, bool isDefaultGateway)
    : type("native"), wan(wanName), is_default_gateway(isDefaultGateway) {}

Router6Attr::Router6Attr(std::string const& typeName, std::string const& wanName,
                         std::string const& routedPrefix, std::string const& localV4,
                         std::string const& remoteV4, std::string const& localV6,
                         bool isDefaultGateway)
    : type(typeName),
      wan(wanName),
      prefix(routedPrefix),
      local_addr_v4(localV4),
      remote_addr_v4(remoteV4),
      local_addr_v6(localV6),
      is_default_gateway(isDefaultGateway) {}

std::string Router6Attr::ConvertInterface(std::string const& name) {
  if (name != "pppoe") return name;
  char buffer[1024] = "";
  if (VORNPPPoeIntfGet(buffer, sizeof buffer) < 0) {
    VORN_LOG(LOG_INFO, "Failed to get PPPoE interface");
    return "";
  }
  return buffer;
}

std::string Router6Attr::GetConfigName() const { return kConfigPrefix + ConvertInterface(wan); }

int Router6Attr::RemoveConfig() const {
  const std::string path = GetConfigName();
  if (unlink(path.c_str()) != 0) {
    VORN_LOG(LOG_ERR, "Failed to remove config [file: %s]", path.c_str());
    return -1;
  }
  return 0;
}

int Router6Attr::SaveConfig() const {
  PVLIBSZHASH hash = VLIBCSzHashAlloc(kHashCapacity);
  if (!hash) {
    VORN_LOG(LOG_ERR, "Failed to allocate PVLIBSZHASH");
    return -1;
  }
  HashHolder holder(hash);
  const std::string path = GetConfigName();
  // The directory is part of the appliance's layout; a bare system gets it here.
  if (mkdir(kRouter6ConfigDir, 0755) != 0 && errno != EEXIST) {
    VORN_LOG(LOG_ERR, "Failed to create directory [%s]", kRouter6ConfigDir);
  }
  if (VLIBCFileExist(path.c_str()) == 1) RemoveConfig();

  VLIBCHashRemoveAll(hash);
  if (!Fill(hash, "type", type) || !Fill(hash, "wan", wan) || !Fill(hash, "prefix", prefix) ||
      !Fill(hash, "is_default_gateway", is_default_gateway ? "yes" : "no")) {
    VORN_LOG(LOG_ERR, "Failed to generate config section");
    return -1;
  }
  if (VLIBCFileAddSection(path.c_str(), "conf", hash, kSectionFormat) < 1) {
    VORN_LOG(LOG_ERR, "Failed to add config section [file: %s]", path.c_str());
    return -1;
  }

  VLIBCHashRemoveAll(hash);
  if (!Fill(hash, "local_addr_v4", local_addr_v4) ||
      !Fill(hash, "remote_addr_v4", remote_addr_v4) ||
      !Fill(hash, "local_addr_v6", local_addr_v6)) {
    VORN_LOG(LOG_ERR, "Failed to generate address section");
    return -1;
  }
  if (VLIBCFileAddSection(path.c_str(), "addr", hash, kSectionFormat) < 1) {
    VORN_LOG(LOG_ERR, "Failed to add address section [file: %s]", path.c_str());
    return -1;
  }

  VLIBCHashRemoveAll(hash);
  for (LanList::const_iterator it = lans.begin(); it != lans.end(); ++it) {
    if (!Fill(hash, it->first.c_str(), it->second)) {
      VORN_LOG(LOG_ERR, "Failed to generate prefix section");
      return -1;
    }
  }
  if (VLIBCFileAddSection(path.c_str(), "lan", hash, kSectionFormat) < 1) {
    VORN_LOG(LOG_ERR, "Failed to add prefix section [file: %s]", path.c_str());
    return -1;
  }
  return 0;
}

int Router6Attr::LoadConfig() {
  const std::string path = GetConfigName();
  if (VLIBCFileExist(path.c_str()) != 1) {
    VORN_LOG(LOG_INFO, "No existing IPv6 config");
    return -1;
  }
  PVLIBSZHASH hash = VLIBCSzHashAlloc(kHashCapacity);
  if (!hash) {
    VORN_LOG(LOG_ERR, "Failed to allocate PVLIBSZHASH");
    return -1;
  }
  HashHolder holder(hash);

  if (VLIBCFileGetSection(path.c_str(), "conf", &holder.hash) < 0) {
    VORN_LOG(LOG_ERR, "Failed to load config section [file: %s]", path.c_str());
    return -1;
  }
  Get(holder.hash, "type", type);
  Get(holder.hash, "wan", wan);
  Get(holder.hash, "prefix", prefix);
  // The key's presence makes a default gateway, whatever its value.
  is_default_gateway = VLIBCSzHashGetValue(holder.hash, "is_default_gateway") != nullptr;

  if (VLIBCFileGetSection(path.c_str(), "addr", &holder.hash) < 0) {
    VORN_LOG(LOG_ERR, "Failed to load address section [file: %s]", path.c_str());
    return -1;
  }
  Get(holder.hash, "local_addr_v4", local_addr_v4);
  Get(holder.hash, "remote_addr_v4", remote_addr_v4);
  Get(holder.hash, "local_addr_v6", local_addr_v6);

  if (VLIBCFileGetSection(path.c_str(), "lan", &holder.hash) < 0) {
    VORN_LOG(LOG_ERR, "Failed to load prefix section [file: %s]", path.c_str());
    return -1;
  }
  lans.clear();
  for (int i = 0; i < holder.hash->nSlot; ++i) {
    if (!holder.hash->pSlots[i].szKey) continue;
    lans.push_back(std::make_pair(std::string(holder.hash->pSlots[i].szKey),
                                  std::string(holder.hash->pSlots[i].szValue
                                                  ? holder.hash->pSlots[i].szValue
                                                  : "")));
  }

  // The live gateway database outranks the file.
  const std::string converted = ConvertInterface(wan);
  const std::string gatewayName = type == "native" ? converted : "6in4-" + converted;
  const int priority = vornwireless::utils::GetGatewayPriority(gatewayName, "GTYPE_V6");
  if (priority >= 0) is_default_gateway = priority == 0;
  return 0;
}

Json::Value Router6Attr::ToJson() const {
  Json::Value root(Json::objectValue);
  Json::Value config(Json::objectValue);
  if (!wan.empty()) config["wan"] = wan;
  if (!prefix.empty()) config["prefix"] = prefix;
  // The local address goes under the remote's key and gives way to a real remote address.
  if (!local_addr_v4.empty()) config["remote_addr_v4"] = local_addr_v4;
  if (!remote_addr_v4.empty()) config["remote_addr_v4"] = remote_addr_v4;
  if (!local_addr_v6.empty()) config["local_addr_v6"] = local_addr_v6;
  if (!config.empty()) root["config"] = config;
  if (!type.empty()) root["type"] = type;
  root["is_default_gateway"] = is_default_gateway;
  return root;
}

bool Router6Attr::operator==(Router6Attr const& other) const {
  return type == other.type && wan == other.wan && prefix == other.prefix &&
         local_addr_v4 == other.local_addr_v4 && remote_addr_v4 == other.remote_addr_v4 &&
         local_addr_v6 == other.local_addr_v6 && is_default_gateway == other.is_default_gateway;
}

void Router6Attr::AddLan(std::string const& lanPrefix, std::string const& lan) {
  if (lanPrefix.empty() || lan.empty()) return;
  lans.push_back(std::make_pair(lanPrefix, lan));
}

void Router6Attr::RemoveLan(std::string const& lanPrefix, std::string const& lan) {
  if (lanPrefix.empty() || lan.empty()) return;
  for (LanList::iterator it = lans.begin(); it != lans.end(); ++it) {
    if (it->first == lanPrefix && it->second == lan) {
      lans.erase(it);
      return;
    }
  }
}

}  // namespace router
}  // namespace ipv6
}  // namespace network
}  // namespace vorn
