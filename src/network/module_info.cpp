// The daemon's module table, in creation order.
#include "vornplatform/log.h"
#include "vornwireless/network/devicelist/device_list_module.h"
#include "vornwireless/network/ipv6/ipv6_module.h"
#include "vornwireless/network/module_manager.h"
#include "vornwireless/network/netlink/netlink_module.h"
#include "vornwireless/network/route/route_module.h"
#include "vornwireless/network/test_module/test_module.h"

namespace vornnetwork {
namespace network {
namespace module {

namespace {

// Stands in for the factory of a module this build does not carry: the manager reports the
// module as not created and requests to it find no module.
template <MODULE_TYPE type>
BaseModule* CreateUnavailable() {
  VORN_LOG(LOG_INFO, "The network module [%d] is not available in this build", type);
  return nullptr;
}

}  // namespace

ModuleManager::MODULE_INFO const ModuleManager::module_info[] = {
    {MODULE_TEST, false, TestModule::Create},
    {MODULE_NETLINK, true, NetlinkModule::Create},
    {MODULE_IPV6, true, IPv6Module::Create},
    {MODULE_ROUTE, true, RouteModule::Create},
    {MODULE_DEVICELIST, true, DeviceListModule::Create},
};

std::size_t const ModuleManager::module_info_count =
    sizeof(ModuleManager::module_info) / sizeof(ModuleManager::module_info[0]);

}  // namespace module
}  // namespace network
}  // namespace vornnetwork
