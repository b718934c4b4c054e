#include "vornwireless/hook/bond_change_hook.h"

namespace vornwireless {
namespace hook {

BondChangeHook::BondChangeHook(std::string const& action) : BaseHook("net", "net/bond_change") {
  SetEnv("ACTION", action);
}

BondChangeHook::~BondChangeHook() {}

}  // namespace hook
}  // namespace vornwireless
