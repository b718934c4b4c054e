// The address family of a routing table or rule.
#ifndef VORNWIRELESS_NETWORK_ROUTE_IP_TYPE_H
#define VORNWIRELESS_NETWORK_ROUTE_IP_TYPE_H

namespace vornnetwork {
namespace network {

enum IP_TYPE {
  IPTYPE_V4 = 0,
  IPTYPE_V6 = 1,
};

}  // namespace network
}  // namespace vornnetwork

#endif
