// One entry of a gateway list: an interface that can carry the default route.
#ifndef VORNWIRELESS_NETWORK_ROUTE_GATEWAY_INFO_H
#define VORNWIRELESS_NETWORK_ROUTE_GATEWAY_INFO_H

#include <string>

#include "vornwireless/utils/ip_address.h"

namespace vornnetwork {
namespace network {
namespace module {

// The family of a gateway list; in JSON "GTYPE_V4" / "GTYPE_V6".
enum GATEWAY_TYPE {
  GTYPE_V4 = 0,
  GTYPE_V6 = 1,
};

// Copy, assignment and destruction are member by member.
class GatewayInfo {
 public:
  GatewayInfo() = default;

  std::string _ifname;                      // the key of an entry within its list
  std::string _class;                       // "ethernet", "lan", "wan", ...; "unknown" when added
  vornwireless::utils::IPAddress _gateway;  // empty when not known
  vornwireless::utils::IPAddress _dns;      // empty when not known
  bool _slave = false;                      // enslaved: never a default route
};

}  // namespace module
}  // namespace network
}  // namespace vornnetwork

#endif
