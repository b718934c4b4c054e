#include "vornwireless/hook/gateway_change_hook.h"

namespace vornwireless {
namespace hook {

GatewayChangeHook::GatewayChangeHook(std::string const& action, std::string const& ifname,
                                     std::string const& destination, std::string const& gateway)
    : BaseHook("net", "net/gateway_change") {
  SetEnv("ACTION", action);
  SetEnv("IFNAME", ifname);
  SetEnv("DESTINATION", destination.empty() ? "0.0.0.0" : destination);
  SetEnv("GATEWAY", gateway.empty() ? "0.0.0.0" : gateway);
}

GatewayChangeHook::~GatewayChangeHook() {}

bool GatewayChangeHook::IsValid() const {
  return !GetEnv("ACTION").empty() && !GetEnv("IFNAME").empty();
}

}  // namespace hook
}  // namespace vornwireless
