// "net/topology_change": OLD_TOPOLOGY and NEW_TOPOLOGY; valid when both are given.
#ifndef VORNWIRELESS_HOOK_TOPOLOGY_CHANGE_HOOK_H
#define VORNWIRELESS_HOOK_TOPOLOGY_CHANGE_HOOK_H

#include <string>

#include "vornplatform/hook.h"

namespace vornwireless {
namespace hook {

class TopologyChangeHook : public vornnetsdk::hook::BaseHook {
 public:
  TopologyChangeHook(std::string const& oldTopology, std::string const& newTopology);
  ~TopologyChangeHook() override;
  bool IsValid() const override;
};

}  // namespace hook
}  // namespace vornwireless

#endif
