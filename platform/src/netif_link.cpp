// Link state from sysfs; an OVS bond master takes it from the members of its SLAVE_LIST.
#include "vornplatform/netif_link.h"

#include <net/if.h>

#include <cerrno>
#include <cstring>
#include <sstream>
#include <string>

#include "internal.h"
#include "vornplatform/err.h"
#include "vornplatform/file.h"

namespace {

bool ValidIfName(const char* ifname) {
  return vornplatform::internal::HasText(ifname) && std::strlen(ifname) < IFNAMSIZ &&
         std::strchr(ifname, '/') == nullptr && std::strcmp(ifname, ".") != 0 &&
         std::strcmp(ifname, "..") != 0;
}

// 1 carrier, 0 none (or down: the kernel refuses to read carrier then), -1 no such interface.
int Carrier(const std::string& ifname) {
  const std::string dir = "/sys/class/net/" + ifname;
  if (VLIBCFileExist(dir.c_str()) != 1) return -1;
  std::string text;
  if (vornplatform::internal::ReadWholeFile((dir + "/carrier").c_str(), text, 64) != 0) return 0;
  return text.compare(0, 1, "1") == 0 ? 1 : 0;
}

}  // namespace

int VORNNetIfIsLink(const char* ifname) {
  if (!ValidIfName(ifname)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return vornplatform::internal::NoThrow(-1, [&]() -> int {
    const std::string ifcfg = std::string("/etc/sysconfig/network-scripts/ifcfg-") + ifname;
    char slaves[1024];
    if (VLIBCFileGetKeyValue(ifcfg.c_str(), "SLAVE_LIST", slaves, sizeof slaves, 0) > 0) {
      std::istringstream words(slaves);
      std::string member;
      while (words >> member) {
        if (ValidIfName(member.c_str()) && Carrier(member) == 1) return 1;
      }
      return 0;
    }
    const int link = Carrier(ifname);
    if (link < 0) {
      errno = ENODEV;
      VLIBC_ERR_SET(VLIBC_ERR_NOT_FOUND);
    }
    return link;
  });
}
