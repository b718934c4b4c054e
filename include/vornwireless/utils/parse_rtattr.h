// Netlink attributes of one message, by type.
#ifndef VORNWIRELESS_UTILS_PARSE_RTATTR_H
#define VORNWIRELESS_UTILS_PARSE_RTATTR_H

#include <linux/rtnetlink.h>

namespace vornwireless {
namespace utils {

// Fills table[0..max] (max + 1 slots) with the attributes of the length bytes from first: the
// first attribute of each type up to max wins, other slots are NULL. A malformed length ends the
// walk and is logged. Always 0.
int parse_rtattr(rtattr** table, int max, rtattr* first, int length);

}  // namespace utils
}  // namespace vornwireless

#endif
