// 6in4 and 6to4 routing: a sit tunnel "6in4-<WAN>" to the remote end point.
#ifndef VORNWIRELESS_IPV6ROUTER_6IN4_H
#define VORNWIRELESS_IPV6ROUTER_6IN4_H

#include <string>

#include "vornwireless/ipv6router/router6_base.h"

namespace vorn {
namespace network {
namespace ipv6 {
namespace router {

class Tunnel6in4 : public Router6Base {
 public:
  explicit Tunnel6in4(Router6Attr const& attr) : Router6Base(attr) {}
  bool Create() const override;
  // True when the gateway entry and the record went away (a tunnel already gone is no failure).
  bool Destroy() const override;
  bool ValidateAttr() const override;
  // "6in4-" plus the converted WAN.
  std::string DeviceName() const;
};

}  // namespace router
}  // namespace ipv6
}  // namespace network
}  // namespace vorn

#endif
