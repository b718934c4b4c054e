// The records of one route of a routing table, shared by the static table and the per-interface
// tables.
#ifndef VORNWIRELESS_NETWORK_ROUTE_ROUTE_RULE_H
#define VORNWIRELESS_NETWORK_ROUTE_ROUTE_RULE_H

#include <string>

#include "vornwireless/network/route/ip_type.h"
#include "vornwireless/utils/ip_address.h"

namespace vornnetwork {
namespace network {

class RouteRule {
 public:
  IP_TYPE type = IPTYPE_V4;
  vornwireless::utils::IPAddress ip;       // destination network
  vornwireless::utils::IPAddress mask;     // IPv4 network mask
  vornwireless::utils::IPAddress gateway;  // next hop
  std::string prefix_length;               // IPv6 prefix length, decimal text
  std::string ifname;                      // output interface
};

// A rule of the static table: kept in its file also while switched off.
class StaticRouteRule : public RouteRule {
 public:
  bool enable = false;
};

// A rule of an interface's table, stored in the section `name` of the table's rule file.
class PolicyRouteRule : public RouteRule {
 public:
  std::string name;
};

}  // namespace network
}  // namespace vornnetwork

#endif
