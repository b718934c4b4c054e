// The DHCPv6 DUID of the appliance, from eth0's MAC address.
#include "vornwireless/utils/gen_duid.h"

#include <cstdio>

#include "vornplatform/log.h"
#include "vornplatform/netif.h"

namespace vornwireless {
namespace utils {

std::string GenDUID() {
  char const ifname[] = "eth0";
  VORN_NETIF_INFO info;
  if (VORNNetIFGetInfo_S(ifname, &info) < 0) {
    VORN_LOG(LOG_ERR, "Error getting %s info", ifname);
    return std::string();
  }
  char text[128];
  std::snprintf(text, sizeof(text),
                "\\x00\\x03\\x00\\x01\\x%02X\\x%02X\\x%02X\\x%02X\\x%02X\\x%02X", info.mac[0],
                info.mac[1], info.mac[2], info.mac[3], info.mac[4], info.mac[5]);
  return text;
}

}  // namespace utils
}  // namespace vornwireless
