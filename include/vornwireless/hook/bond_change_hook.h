// "net/bond_change": a bond changed; ACTION says how.
#ifndef VORNWIRELESS_HOOK_BOND_CHANGE_HOOK_H
#define VORNWIRELESS_HOOK_BOND_CHANGE_HOOK_H

#include <string>

#include "vornplatform/hook.h"

namespace vornwireless {
namespace hook {

class BondChangeHook : public vornnetsdk::hook::BaseHook {
 public:
  explicit BondChangeHook(std::string const& action);
  ~BondChangeHook() override;
};

}  // namespace hook
}  // namespace vornwireless

#endif
