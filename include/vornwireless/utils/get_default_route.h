// Default routes as the kernel lists them in /proc/net/route and /proc/net/ipv6_route.
#ifndef VORNWIRELESS_UTILS_GET_DEFAULT_ROUTE_H
#define VORNWIRELESS_UTILS_GET_DEFAULT_ROUTE_H

#include <string>
#include <vector>

namespace vornwireless {
namespace utils {
namespace routeparse {

struct Route {
  int metric = 0;
  std::string gateway;
  std::string ifname;
  bool operator<(Route const& other) const { return metric < other.metric; }
};

// One line of /proc/net/route: a default route (up, with gateway, destination 0) is appended.
struct ParseV4 {
  static char const* RouteFile;  // "/proc/net/route"
  void operator()(char const* line, std::vector<Route>& routes) const;
  // The kernel's hexadecimal gateway word as dotted text ("" when it is not a number).
  static std::string formatAddress(std::string const& hex);
};

// One line of /proc/net/ipv6_route, with the same filter.
struct ParseV6 {
  static char const* RouteFile;  // "/proc/net/ipv6_route"
  void operator()(char const* line, std::vector<Route>& routes) const;
  // 32 hexadecimal digits as compressed IPv6 text; "" for another length or a bad text.
  static std::string formatAddress(std::string const& hex);
};

}  // namespace routeparse

// The gateway of the default route with the lowest metric, "" when there is none.
// family is AF_INET or AF_INET6.
template <int family>
std::string GetDefaultRoute();
// The number of default routes, -1 when the route file cannot be opened.
template <int family>
int GetNumDefaultRoutes();

}  // namespace utils
}  // namespace vornwireless

#endif
