// The numbers of the network daemon's modules.
#ifndef VORNWIRELESS_NETWORK_MODULE_TYPE_H
#define VORNWIRELESS_NETWORK_MODULE_TYPE_H

namespace vornnetwork {
namespace network {
namespace module {

enum MODULE_TYPE {
  MODULE_TEST = 1,        // TestModule, the framework's sample (disabled)
  MODULE_IPV6 = 2,        // IPv6Module
  MODULE_ROUTE = 3,       // RouteModule
  MODULE_DEVICELIST = 4,  // DeviceListModule
  MODULE_NETLINK = 5,     // NetlinkModule
};

}  // namespace module
}  // namespace network
}  // namespace vornnetwork

#endif
