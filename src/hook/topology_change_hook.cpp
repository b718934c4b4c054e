#include "vornwireless/hook/topology_change_hook.h"

namespace vornwireless {
namespace hook {

TopologyChangeHook::TopologyChangeHook(std::string const& oldTopology,
                                       std::string const& newTopology)
    : BaseHook("net", "net/topology_change") {
  SetEnv("OLD_TOPOLOGY", oldTopology);
  SetEnv("NEW_TOPOLOGY", newTopology);
}

TopologyChangeHook::~TopologyChangeHook() {}

bool TopologyChangeHook::IsValid() const {
  return !GetEnv("OLD_TOPOLOGY").empty() && !GetEnv("NEW_TOPOLOGY").empty();
}

}  // namespace hook
}  // namespace vornwireless
