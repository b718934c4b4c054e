#include "vornwireless/hook/arp_ignore_change_hook.h"

namespace vornwireless {
namespace hook {

ArpIgnoreChangeHook::ArpIgnoreChangeHook(bool newValue) : BaseHook("net", "net/arp_ignore_change") {
  SetEnv("NEW_VALUE", newValue ? "true" : "false");
}

ArpIgnoreChangeHook::~ArpIgnoreChangeHook() {}

}  // namespace hook
}  // namespace vornwireless
