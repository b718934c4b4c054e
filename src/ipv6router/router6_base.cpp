// The steps every IPv6 router mode shares.
#include "vornwireless/ipv6router/router6_base.h"

#include "vornplatform/file.h"
#include "vornplatform/ipv6.h"
#include "vornplatform/log.h"
#include "vornwireless/utils/file.h"

namespace vorn {
namespace network {
namespace ipv6 {
namespace router {

namespace {
const char kIfcfgPrefix[] = "/etc/sysconfig/network-scripts/ifcfg-";
const char kForwarding[] = "/proc/sys/net/ipv6/conf/all/forwarding";
}  // namespace

bool Router6Base::ValidateAttr() const {
  const std::string wan = Router6Attr::ConvertInterface(_attr.wan);
  if (VORNNetIsDevTypeMatch(wan.c_str(), VORN_DEV_TYPE_PPP) == 1 &&
      VORNLnxIPv6ProcAction(wan.c_str(), 0) != 0) {
    VORN_LOG(LOG_ERR, "Failed to enable IPv6 on dev [%s]", wan.c_str());
    return false;
  }
  if (!vornwireless::utils::SetProcEntry(kForwarding, "1")) {
    VORN_LOG(LOG_ERR, "Failed to enable IPv6 forwarding in [%s]", kForwarding);
    return false;
  }
  return true;
}

bool Router6Base::SetSysConfig(bool enable) const {
  const std::string wan = Router6Attr::ConvertInterface(_attr.wan);
  if (wan.empty()) {
    VORN_LOG(LOG_INFO, "Empty wan, skip");
    return true;
  }
  const std::string path = kIfcfgPrefix + wan;
  const char* value = enable ? "yes" : "no";
  if (VLIBCFileSetKeyValue(path.c_str(), "IPV6ROUTER", value, "%s=%s\n") < 0) {
    VORN_LOG(LOG_ERR, "Failed to set %s=%s in %s", "IPV6ROUTER", value, path.c_str());
    return false;
  }
  return true;
}

bool Router6Base::Create() const {
  const bool saved = _attr.SaveConfig() == 0;
  const bool marked = SetSysConfig(true);
  return saved && marked;
}

bool Router6Base::Destroy() const {
  const bool removed = _attr.RemoveConfig() == 0;
  const bool cleared = SetSysConfig(false);
  return removed && cleared;
}

}  // namespace router
}  // namespace ipv6
}  // namespace network
}  // namespace vorn
