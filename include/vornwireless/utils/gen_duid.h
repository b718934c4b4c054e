// The DHCPv6 DUID of the appliance.
#ifndef VORNWIRELESS_UTILS_GEN_DUID_H
#define VORNWIRELESS_UTILS_GEN_DUID_H

#include <string>

namespace vornwireless {
namespace utils {

// The DUID-LL of eth0's MAC address as text with "\xNN" escapes; empty on failure.
std::string GenDUID();

}  // namespace utils
}  // namespace vornwireless

#endif
