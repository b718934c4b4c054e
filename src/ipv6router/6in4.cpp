// 6in4 and 6to4 routing through a sit tunnel.
#include "vornwireless/ipv6router/6in4.h"

#include <cstdio>

#include "vornplatform/ipv6.h"
#include "vornplatform/log.h"
#include "vornplatform/proc.h"
#include "vornwireless/utils/dbus_client.h"

namespace vorn {
namespace network {
namespace ipv6 {
namespace router {

namespace {
const char kIp[] = "/sbin/ip";
const int kExeclFlags = 0xbb;
}  // namespace

std::string Tunnel6in4::DeviceName() const {
  return "6in4-" + Router6Attr::ConvertInterface(_attr.wan);
}

bool Tunnel6in4::ValidateAttr() const {
  if (BlVLIBIsIpAddr(_attr.local_addr_v4.c_str()) != 1) {
    VORN_LOG(LOG_ERR, "Invalid local v4 address (%s)", _attr.local_addr_v4.c_str());
    return false;
  }
  if (BlVLIBIsIpAddr(_attr.remote_addr_v4.c_str()) != 1) {
    VORN_LOG(LOG_ERR, "Invalid remote v4 address (%s)", _attr.remote_addr_v4.c_str());
    return false;
  }
  return Router6Base::ValidateAttr();
}

bool Tunnel6in4::Create() const {
  const std::string wan = Router6Attr::ConvertInterface(_attr.wan);
  if (wan.empty()) {
    VORN_LOG(LOG_ERR, "Failed to get WAN, may caused by broken PPPoE connection");
    return false;
  }
  const std::string device = "6in4-" + wan;
  char address[64] = "";
  int length = 0;
  if (std::sscanf(_attr.local_addr_v6.c_str(), "%63[^/]/%d", address, &length) != 2) {
    length = 0;
  }
  if (VLIBCExecl(kIp, kExeclFlags, "tunnel", "add", device.c_str(), "mode", "sit", "remote",
                 _attr.remote_addr_v4.c_str(), "local", _attr.local_addr_v4.c_str(), "ttl",
                 "255", nullptr) != 0) {
    VORN_LOG(LOG_ERR, "Failed to create tunnel device %s (%s -> %s)", device.c_str(),
             _attr.local_addr_v4.c_str(), _attr.remote_addr_v4.c_str());
    return false;
  }
  if (VLIBCExecl(kIp, kExeclFlags, "link", "set", device.c_str(), "up", nullptr) != 0) {
    VORN_LOG(LOG_ERR, "Failed to bring up device %s", device.c_str());
    return false;
  }
  if (VORNNetSetIP("-6", device.c_str(), address, length, "add") < 0) {
    VORN_LOG(LOG_ERR, "Failed to add [%s] to device %s", _attr.local_addr_v6.c_str(),
             device.c_str());
    return false;
  }
  if (!vornwireless::utils::SetGatewayInfo(device, "GTYPE_V6", "::", "NULL", "ethernet",
                                           GatewayPriority(), true)) {
    VORN_LOG(LOG_ERR, "Failed to add gateway info on dev %s", device.c_str());
    return false;
  }
  return Router6Base::Create();
}

bool Tunnel6in4::Destroy() const {
  const std::string device = DeviceName();
  if (VLIBCExecl(kIp, kExeclFlags, "tunnel", "del", device.c_str(), nullptr) != 0) {
    VORN_LOG(LOG_WARNING, "Unable to delete tunnel device %s", device.c_str());
  }
  const bool deleted = vornwireless::utils::DelGatewayInfo(device, "GTYPE_V6", true);
  if (!deleted) {
    VORN_LOG(LOG_WARNING, "Failed to del gateway info on dev %s", device.c_str());
  }
  const bool destroyed = Router6Base::Destroy();
  return deleted && destroyed;
}

}  // namespace router
}  // namespace ipv6
}  // namespace network
}  // namespace vorn
