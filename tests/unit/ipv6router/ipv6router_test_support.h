// Shared set-up of the IPv6 router tests: a clean record directory and ifcfg directory.
#ifndef VORN_TESTS_UNIT_IPV6ROUTER_SUPPORT_H
#define VORN_TESTS_UNIT_IPV6ROUTER_SUPPORT_H

#include <sys/stat.h>

#include <ostream>
#include <string>

#include "support/test_util.h"
#include "vornwireless/ipv6router/router6_attr.h"

namespace vorn {
namespace network {
namespace ipv6 {
namespace router {
// gtest shows records field by field.
inline void PrintTo(Router6Attr const& a, std::ostream* os) {
  *os << "{" << a.type << ", " << a.wan << ", " << a.prefix << ", " << a.local_addr_v4 << ", "
      << a.remote_addr_v4 << ", " << a.local_addr_v6 << ", default " << a.is_default_gateway
      << ", " << a.lans.size() << " lans}";
}
}  // namespace router
}  // namespace ipv6
}  // namespace network
}  // namespace vorn

namespace ipv6routertest {

const std::string kRecordDir = "/etc/sysconfig/networking";
const std::string kIfcfgDir = "/etc/sysconfig/network-scripts";

inline void CleanDirs() {
  vorntest::Run({"/bin/rm", "-rf", kRecordDir, kIfcfgDir});
  mkdir("/etc/sysconfig", 0755);
  mkdir(kRecordDir.c_str(), 0755);
  mkdir(kIfcfgDir.c_str(), 0755);
}

inline std::string Record(const std::string& wan) {
  return vorntest::ReadFile(kRecordDir + "/ipv6-" + wan);
}

}  // namespace ipv6routertest

#endif
