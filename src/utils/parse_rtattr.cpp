// Netlink attributes by type.
#include "vornwireless/utils/parse_rtattr.h"

#include <cstring>

#include "vornplatform/log.h"

namespace vornwireless {
namespace utils {

int parse_rtattr(rtattr** table, int max, rtattr* first, int length) {
  if (table == nullptr || max < 0) return 0;
  std::memset(table, 0, sizeof(rtattr*) * (static_cast<unsigned>(max) + 1));
  rtattr* rta = first;
  int rtaLen = 0;
  while (rta != nullptr && length >= static_cast<int>(sizeof(rtattr))) {
    rtaLen = rta->rta_len;
    if (rtaLen < static_cast<int>(sizeof(rtattr)) || rtaLen > length) {
      VORN_LOG(LOG_ERR, "Bad attribute length %d, %d bytes left", rtaLen, length);
      break;
    }
    if (rta->rta_type <= max && table[rta->rta_type] == nullptr) table[rta->rta_type] = rta;
    const int step = static_cast<int>(RTA_ALIGN(rtaLen));
    length -= step;
    rta = reinterpret_cast<rtattr*>(reinterpret_cast<char*>(rta) + step);
  }
  if (length != 0) VORN_LOG(LOG_ERR, "!!!Deficit %d, rta_len=%d\n", length, rtaLen);
  return 0;
}

}  // namespace utils
}  // namespace vornwireless
