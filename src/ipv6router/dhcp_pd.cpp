// Native IPv6 routing: the DHCPv6 prefix-delegation client of the WAN.
#include "vornwireless/ipv6router/dhcp_pd.h"

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

const char kJob[] = "dhcp-client6";
const char kAction[] = "pd";

// Runs the job-control program with the job of the WAN.
int RunJob(const char* program, std::string const& wan) {
  char iface[32];
  char action[32];
  std::snprintf(iface, sizeof iface, "IFACE=%s", wan.c_str());
  std::snprintf(action, sizeof action, "ACTION=%s", kAction);
  char job[sizeof kJob];
  std::snprintf(job, sizeof job, "%s", kJob);
  char path[32];
  std::snprintf(path, sizeof path, "%s", program);
  char* const argv[] = {path, job, iface, action, nullptr};
  return VLIBCExecv(program, argv, 1);
}

}  // namespace

bool DHCPPD::ValidateAttr() const {
  const std::string wan = Router6Attr::ConvertInterface(_attr.wan);
  if (VORNNetIsIFUp(wan.c_str()) != 1) {
    VORN_LOG(LOG_ERR, "wan interface %s is down", wan.c_str());
    return false;
  }
  if (!Router6Base::ValidateAttr()) {
    VORN_LOG(LOG_ERR, "Base check failed");
    return false;
  }
  return true;
}

bool DHCPPD::StartDHCPPD() const {
  const std::string wan = Router6Attr::ConvertInterface(_attr.wan);
  char pidFile[128];
  std::snprintf(pidFile, sizeof pidFile, "/tmp/dhclient6-%s-%s.pid", wan.c_str(), kAction);
  const char* program = VLIBCProcAliveByPidFile(pidFile) == 1 ? "/sbin/restart" : "/sbin/start";
  if (RunJob(program, wan) < 0) {
    VORN_LOG(LOG_ERR, "Failed to start dhclient on interface [%s]", wan.c_str());
    return false;
  }
  return true;
}

bool DHCPPD::StopDHCPPD() const {
  const std::string wan = Router6Attr::ConvertInterface(_attr.wan);
  return RunJob("/sbin/stop", wan) >= 0;
}

bool DHCPPD::Create() const {
  const std::string wan = Router6Attr::ConvertInterface(_attr.wan);
  if (!StartDHCPPD()) {
    VORN_LOG(LOG_ERR, "Failed to execute dhclient on dev [%s]", wan.c_str());
    return false;
  }
  if (!vornwireless::utils::SetGatewayInfo(wan, "GTYPE_V6", "NULL", "NULL", "ethernet",
                                           GatewayPriority(), true)) {
    VORN_LOG(LOG_ERR, "Failed to add gateway info on dev %s", wan.c_str());
    return false;
  }
  return Router6Base::Create();
}

bool DHCPPD::Destroy() const {
  if (!StopDHCPPD()) {
    VORN_LOG(LOG_WARNING, "Unable to release lease on dev [%s]",
             Router6Attr::ConvertInterface(_attr.wan).c_str());
  }
  return Router6Base::Destroy();
}

}  // namespace router
}  // namespace ipv6
}  // namespace network
}  // namespace vorn
