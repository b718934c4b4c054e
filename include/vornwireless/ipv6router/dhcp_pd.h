// Native IPv6 routing: a DHCPv6 client asks the WAN's provider for a delegated prefix.
#ifndef VORNWIRELESS_IPV6ROUTER_DHCP_PD_H
#define VORNWIRELESS_IPV6ROUTER_DHCP_PD_H

#include "vornwireless/ipv6router/router6_base.h"

namespace vorn {
namespace network {
namespace ipv6 {
namespace router {

class DHCPPD : public Router6Base {
 public:
  explicit DHCPPD(Router6Attr const& attr) : Router6Base(attr) {}
  // Two native routers are never equal, so that a reconfiguration always runs.
  bool operator==(Router6Base const&) const override { return false; }
  bool operator!=(Router6Base const&) const override { return true; }
  bool Create() const override;
  bool Destroy() const override;
  bool ValidateAttr() const override;

  // The job "dhcp-client6" of the WAN: restarted when its client runs, else started.
  bool StartDHCPPD() const;
  bool StopDHCPPD() const;
};

}  // namespace router
}  // namespace ipv6
}  // namespace network
}  // namespace vorn

#endif
