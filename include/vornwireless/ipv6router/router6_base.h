// A running IPv6 router mode: brought up by Create and ended by Destroy. The base class's
// versions are the steps every mode shares.
#ifndef VORNWIRELESS_IPV6ROUTER_ROUTER6_BASE_H
#define VORNWIRELESS_IPV6ROUTER_ROUTER6_BASE_H

#include "vornwireless/ipv6router/router6_attr.h"

namespace vorn {
namespace network {
namespace ipv6 {
namespace router {

class Router6Base {
 public:
  explicit Router6Base(Router6Attr const& attr) : _attr(attr) {}
  virtual ~Router6Base() {}
  virtual bool operator==(Router6Base const& other) const { return _attr == other._attr; }
  virtual bool operator!=(Router6Base const& other) const { return !(*this == other); }
  // Saves the record and marks the WAN as a router; true when both succeeded.
  virtual bool Create() const;
  // Removes the record and clears the WAN's router mark; true when both succeeded.
  virtual bool Destroy() const;
  // IPv6 on a point-to-point WAN and IPv6 forwarding.
  virtual bool ValidateAttr() const;

  Router6Attr const& GetAttr() const { return _attr; }

 protected:
  // IPV6ROUTER=yes|no in the WAN's ifcfg file; true for an empty WAN.
  bool SetSysConfig(bool enable) const;
  // 0 for a default gateway, -1 otherwise: the priority of the mode's gateway entry.
  int GatewayPriority() const { return _attr.is_default_gateway ? 0 : -1; }

  Router6Attr _attr;
};

}  // namespace router
}  // namespace ipv6
}  // namespace network
}  // namespace vorn

#endif
