// Small network helpers of the modules: subnet text, Ethernet link state, gateway filter.
#include "vornwireless/network/utils.h"

#include <cstdio>
#include <cstring>

#include "vornplatform/ipaddr.h"
#include "vornplatform/log.h"
#include "vornplatform/proc.h"
#include "vornplatform/str.h"
#include "vornplatform/szhash.h"

namespace vornnetwork {
namespace network {

namespace {

const char kEthtool[] = "/usr/bin/ethtool";

// A member as text, "" when absent or not a string.
std::string StringMember(Json::Value const& record, char const* key) {
  Json::Value const& value = record[key];
  return value.isString() ? value.asString() : std::string();
}

bool BoolMember(Json::Value const& record, char const* key) {
  Json::Value const& value = record[key];
  if (value.isBool()) return value.asBool();
  if (value.isIntegral()) return value.asLargestInt() != 0;
  return false;
}

bool StartsWith(std::string const& text, char const* prefix) {
  return text.compare(0, std::strlen(prefix), prefix) == 0;
}

}  // namespace

int GetSubnetFormat(std::string const& ip, std::string const& mask, std::string& out) {
  std::string joined = ip + "/" + mask;
  char text[1024];
  std::snprintf(text, sizeof(text), "%s", joined.c_str());
  char outbuf[1024] = "";
  if (ErrVLIBIpMaskToSubnet(text, outbuf) < 0) {
    VORN_LOG(LOG_ERR, "Failed to translate to ip/mask format to a subnet format.");
    return -1;
  }
  out = outbuf;
  return 0;
}

bool IsEthernetLinkDetected(std::string const& ifname) {
  FILE* fp = VLIBCPopen(kEthtool, "r", ifname.c_str(), static_cast<char const*>(nullptr));
  if (fp == nullptr) {
    VORN_LOG(LOG_ERR, "Failed to execute cmd [%s]", kEthtool);
    return false;
  }
  char line[1024] = "";
  while (std::fgets(line, sizeof(line), fp) != nullptr) {
    if (std::strstr(line, "Link detected") != nullptr) break;
  }
  VLIBCPclose(fp);

  bool detected = false;
  PVLIBSZLIST list = VLIBCSzListAlloc(512);
  if (list != nullptr && VLIBCStrSep(line, ":", &list) >= 0) {
    char const* second = VLIBCSzListGet(list, 1);
    if (second != nullptr) {
      char value[1024];
      std::snprintf(value, sizeof(value), "%s", second);
      VLIBCStrTrimSpace(value);
      detected = std::strncmp(value, "no", 2) != 0;
    }
  }
  VLIBCSzListFree(list);
  return detected;
}

int FilterList(std::string const& filter, Json::Value& list) {
  if (!list.isArray()) return 0;
  Json::Value kept(Json::arrayValue);
  for (Json::Value::ArrayIndex i = 0; i < list.size(); ++i) {
    Json::Value const& record = list[i];
    if (!record.isObject()) continue;
    std::string ifname = StringMember(record, "ifname");
    std::string gateway = StringMember(record, "gateway");
    std::string klass = StringMember(record, "class");
    if (BoolMember(record, "slave")) continue;
    if (filter == "wan" && gateway.empty()) continue;
    if (klass == "ethernet" && !StartsWith(ifname, "wlan") && !IsEthernetLinkDetected(ifname)) {
      continue;
    }
    bool keep;
    if (filter == "wan") {
      keep = klass != "lan";
    } else if (filter == "lan") {
      keep = klass == "lan";
    } else if (filter == "all") {
      keep = true;
    } else {
      keep = klass == filter;
    }
    if (keep) kept.append(record);
  }
  list.swap(kept);
  return 0;
}

}  // namespace network
}  // namespace vornnetwork
