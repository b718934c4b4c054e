// The address-change event: hook "net/ipv4_change" or "net/ipv6_change".
#ifndef VORNWIRELESS_HOOK_IP_CHANGE_EVENT_H
#define VORNWIRELESS_HOOK_IP_CHANGE_EVENT_H

#include <string>

namespace vornwireless {
namespace hook {

enum _tag_IPTYPE {
  IPTYPE_IPV4 = 0,
  IPTYPE_IPV6 = 1,
};
typedef _tag_IPTYPE IPTYPE;

// Fires the hook with IFNAME, ORIGIN_ADDRESS, NEW_ADDRESS, PREFIX_LENGTH (decimal for IPv6,
// "-1" for IPv4) and IS_LINK ("true"/"false"). 0; -1 for bad parameters (empty ifname or new
// address, unknown type, prefix length above 32 for IPv4 or 128 for IPv6; the error register
// then holds 0xd00), an unreadable link state or a failure of the hook mechanism.
int NetIPChangeEvent(_tag_IPTYPE type, std::string const& ifname, std::string const& originAddress,
                     std::string const& newAddress, int prefixLength);

}  // namespace hook
}  // namespace vornwireless

#endif
