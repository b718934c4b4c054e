// "net/gateway_change": a route of the main table changed. ACTION, IFNAME, DESTINATION and
// GATEWAY (the last two "0.0.0.0" when given empty); valid when ACTION and IFNAME are given.
#ifndef VORNWIRELESS_HOOK_GATEWAY_CHANGE_HOOK_H
#define VORNWIRELESS_HOOK_GATEWAY_CHANGE_HOOK_H

#include <string>

#include "vornplatform/hook.h"

namespace vornwireless {
namespace hook {

class GatewayChangeHook : public vornnetsdk::hook::BaseHook {
 public:
  GatewayChangeHook(std::string const& action, std::string const& ifname,
                    std::string const& destination, std::string const& gateway);
  ~GatewayChangeHook() override;
  bool IsValid() const override;
};

}  // namespace hook
}  // namespace vornwireless

#endif
