// "net/arp_ignore_change": the ARP-ignore setting changed; NEW_VALUE is "true" or "false".
#ifndef VORNWIRELESS_HOOK_ARP_IGNORE_CHANGE_HOOK_H
#define VORNWIRELESS_HOOK_ARP_IGNORE_CHANGE_HOOK_H

#include "vornplatform/hook.h"

namespace vornwireless {
namespace hook {

class ArpIgnoreChangeHook : public vornnetsdk::hook::BaseHook {
 public:
  explicit ArpIgnoreChangeHook(bool newValue);
  ~ArpIgnoreChangeHook() override;
};

}  // namespace hook
}  // namespace vornwireless

#endif
