// Per-interface routing tables and the static table's lookup rules.
//
// This build does not manage the policy tables yet: EnableTable and DisableTable log one
// LOG_INFO line and return 0, so callers (the route module at start) can run their steps.
#ifndef VORNWIRELESS_NETWORK_ROUTE_POLICY_ROUTE_H
#define VORNWIRELESS_NETWORK_ROUTE_POLICY_ROUTE_H

#include <string>

#include "vornwireless/network/route/ip_type.h"

namespace vornnetwork {
namespace network {

class PolicyRoute {
 public:
  PolicyRoute() = default;
  ~PolicyRoute() = default;
  PolicyRoute(PolicyRoute const&) = delete;
  PolicyRoute& operator=(PolicyRoute const&) = delete;

  // Turns the table `name` on for the family, looked up for `source`. 0, negative on failure.
  int EnableTable(IP_TYPE const& type, std::string const& name, std::string const& source);
  // Turns the table `name` off for the family. 0, negative on failure.
  int DisableTable(IP_TYPE const& type, std::string const& name);
};

}  // namespace network
}  // namespace vornnetwork

#endif
