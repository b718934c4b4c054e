// Interface roles from sysfs and the ifcfg files, the interface list from getifaddrs, and the
// platform actions for link changes and for re-applying an interface's settings.
#include "vornplatform/netif_events.h"

#include <ifaddrs.h>
#include <net/if.h>
#include <netinet/in.h>
#include <arpa/inet.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <map>
#include <sstream>
#include <string>
#include <vector>

#include "internal.h"
#include "vornplatform/action.h"
#include "vornplatform/err.h"
#include "vornplatform/file.h"
#include "vornplatform/log.h"

using vornplatform::internal::HasText;
using vornplatform::internal::NoThrow;

namespace {

bool ValidIfName(const char* ifname) {
  return HasText(ifname) && std::strlen(ifname) < IFNAMSIZ && std::strchr(ifname, '/') == nullptr &&
         std::strcmp(ifname, ".") != 0 && std::strcmp(ifname, "..") != 0;
}

// The value of key in the ifcfg file of ifname; "" when absent or unreadable.
std::string IfcfgValue(const std::string& ifname, const char* key) {
  const std::string path = VORN_IFCFG_PREFIX + ifname;
  char buf[1024] = "";
  if (VLIBCFileGetKeyValue(path.c_str(), key, buf, sizeof buf, 0) <= 0) return "";
  return buf;
}

std::vector<std::string> Words(const std::string& text) {
  std::vector<std::string> words;
  std::istringstream in(text);
  std::string w;
  while (in >> w) words.push_back(w);
  return words;
}

// The first line of a sysfs attribute without its line end; false when unreadable.
bool ReadSysAttr(const std::string& path, std::string& value) {
  std::string text;
  if (vornplatform::internal::ReadWholeFile(path.c_str(), text, 4096) != 0) return false;
  const std::size_t end = text.find_first_of("\r\n");
  value = text.substr(0, end);
  return true;
}

int RunLinkAction(const char* action, const char* ifname) {
  if (!ValidIfName(ifname)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return NoThrow(-1, [&]() -> int { return vornplatform::RunStrictAction(action, {ifname}); });
}

}  // namespace

int VORNNetIfIsBondingPassive(const char* ifname) {
  if (!ValidIfName(ifname)) return 0;
  return NoThrow(0, [&]() -> int {
    std::string state;
    if (!ReadSysAttr(std::string("/sys/class/net/") + ifname + "/bonding_slave/state", state)) {
      return 0;
    }
    return state == "backup" ? 1 : 0;
  });
}

int VLIBNetOVSIfIsSlave(const char* ifname) {
  if (!ValidIfName(ifname)) return 0;
  return NoThrow(0, [&]() -> int {
    const std::string master = IfcfgValue(ifname, "MASTER");
    if (master.empty() || !ValidIfName(master.c_str())) return 0;
    for (const std::string& slave : Words(IfcfgValue(master, "SLAVE_LIST"))) {
      if (slave == ifname) return 1;
    }
    return 0;
  });
}

int VLIBNetOVSIfIsMaster(const char* ifname) {
  if (!ValidIfName(ifname)) return 0;
  return NoThrow(0, [&]() -> int {
    return Words(IfcfgValue(ifname, "SLAVE_LIST")).empty() ? 0 : 1;
  });
}

int VLIBNetBridgeIfIsSlave(const char* ifname) {
  if (!ValidIfName(ifname)) return 0;
  return NoThrow(0, [&]() -> int {
    return VLIBCFileExist((std::string("/sys/class/net/") + ifname + "/brport").c_str()) == 1 ? 1
                                                                                               : 0;
  });
}

int BlVORNLnxIsDHCP(const char* ifname) {
  if (!ValidIfName(ifname)) return 0;
  return NoThrow(0, [&]() -> int { return IfcfgValue(ifname, "BOOTPROTO") == "dhcp" ? 1 : 0; });
}

int BlVORNLnxIsDHCP_S(const char* ifname) { return BlVORNLnxIsDHCP(ifname); }

int VLIBNetGetInterfaceInfo(PVLIB_NET_IF_INFO info, int capacity, int kind) {
  if (info == nullptr || capacity < 1 || (kind & VLIB_NET_IF_KIND_ALL) == 0) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return NoThrow(-1, [&]() -> int {
    struct ifaddrs* list = nullptr;
    if (getifaddrs(&list) != 0) {
      VLIBC_ERR_SET(VLIBC_ERR_IO);
      return -1;
    }
    // One record per interface, in index order; the first IPv4 address of each.
    struct Entry {
      std::string name;
      std::string ip;
      unsigned int flags = 0;
    };
    std::map<unsigned int, Entry> byIndex;
    for (struct ifaddrs* a = list; a != nullptr; a = a->ifa_next) {
      if (a->ifa_name == nullptr || (a->ifa_flags & IFF_LOOPBACK) != 0) continue;
      const unsigned int index = if_nametoindex(a->ifa_name);
      if (index == 0) continue;  // gone meanwhile
      Entry& e = byIndex[index];
      e.name = a->ifa_name;
      e.flags = a->ifa_flags;
      if (e.ip.empty() && a->ifa_addr != nullptr && a->ifa_addr->sa_family == AF_INET) {
        char text[INET_ADDRSTRLEN] = "";
        const struct sockaddr_in* sin = reinterpret_cast<const struct sockaddr_in*>(a->ifa_addr);
        if (inet_ntop(AF_INET, &sin->sin_addr, text, sizeof text) != nullptr) e.ip = text;
      }
    }
    freeifaddrs(list);
    int count = 0;
    int left = 0;
    for (const auto& item : byIndex) {
      const Entry& e = item.second;
      const bool physical =
          VLIBCFileExist(("/sys/class/net/" + e.name + "/device").c_str()) == 1;
      if ((kind & (physical ? VLIB_NET_IF_KIND_PHYSICAL : VLIB_NET_IF_KIND_VIRTUAL)) == 0) continue;
      if (count >= capacity) {
        ++left;
        continue;
      }
      VLIB_NET_IF_INFO& r = info[count++];
      std::memset(&r, 0, sizeof r);
      std::snprintf(r.szIfName, sizeof r.szIfName, "%s", e.name.c_str());
      std::snprintf(r.szIP, sizeof r.szIP, "%s", e.ip.c_str());
      r.uFlags = e.flags;
      r.iStatus = (e.flags & IFF_RUNNING) != 0 ? VLIB_NET_IF_STATUS_UP : VLIB_NET_IF_STATUS_DOWN;
    }
    if (left > 0) {
      VORN_LOG(LOG_WARNING, "%d interfaces left out of a list of %d", left, capacity);
    }
    return count;
  });
}

namespace vornnetsdk {
namespace sdk_s {

int VLIBNetIfLinkUpEvent_S(const char* ifname) {
  return RunLinkAction("VLIBNetIfLinkUpEvent", ifname);
}

int VLIBNetIfLinkDownEvent_S(const char* ifname) {
  return RunLinkAction("VLIBNetIfLinkDownEvent", ifname);
}

}  // namespace sdk_s
}  // namespace vornnetsdk

int VORNNetSetCard1_S(PVORN_NETIF_INFO info) {
  if (info == nullptr || info->szIfName[0] == '\0' ||
      std::memchr(info->szIfName, '\0', sizeof info->szIfName) == nullptr ||
      std::memchr(info->szIP, '\0', sizeof info->szIP) == nullptr ||
      std::memchr(info->szMask, '\0', sizeof info->szMask) == nullptr ||
      !ValidIfName(info->szIfName)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return NoThrow(-1, [&]() -> int {
    return vornplatform::RunStrictAction(
        "VORNNetSetCard1", {info->szIfName, std::to_string(info->iFlag), info->szIP, info->szMask});
  });
}
