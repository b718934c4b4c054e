// Default routes from the kernel's route files.
#include "vornwireless/utils/get_default_route.h"

#include <arpa/inet.h>
#include <sys/socket.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <sstream>

#include "vornplatform/log.h"

namespace vornwireless {
namespace utils {
namespace routeparse {

char const* ParseV4::RouteFile = "/proc/net/route";
char const* ParseV6::RouteFile = "/proc/net/ipv6_route";

namespace {

// Up and gateway.
const int kDefaultRouteFlags = 3;

bool AllZeros(std::string const& word) {
  return !word.empty() && word.find_first_not_of('0') == std::string::npos;
}

}  // namespace

std::string ParseV4::formatAddress(std::string const& hex) {
  if (hex.empty() || hex.size() > 8 ||
      hex.find_first_not_of("0123456789abcdefABCDEF") != std::string::npos) {
    return "";
  }
  // The kernel prints the address as a number in its own byte order: keep the bytes as they are.
  in_addr addr;
  addr.s_addr = static_cast<in_addr_t>(std::strtoul(hex.c_str(), nullptr, 16));
  char text[INET_ADDRSTRLEN];
  if (inet_ntop(AF_INET, &addr, text, sizeof text) == nullptr) return "";
  return text;
}

void ParseV4::operator()(char const* line, std::vector<Route>& routes) const {
  std::istringstream in(line);
  std::string ifname, destination, gateway, skipped;
  int flags = 0;
  int metric = 0;
  if (!(in >> ifname >> destination >> gateway >> flags >> skipped >> skipped >> metric)) return;
  if ((flags & kDefaultRouteFlags) != kDefaultRouteFlags || !AllZeros(destination)) return;
  Route route;
  route.metric = metric;
  route.gateway = formatAddress(gateway);
  route.ifname = ifname;
  routes.push_back(route);
}

std::string ParseV6::formatAddress(std::string const& hex) {
  if (hex.size() != 32) return "";
  std::string text;
  for (std::size_t i = 0; i < hex.size(); i += 4) {
    if (i != 0) text += ':';
    text += hex.substr(i, 4);
  }
  in6_addr addr;
  if (inet_pton(AF_INET6, text.c_str(), &addr) != 1) {
    VORN_LOG(LOG_ERR, "convert gateway format failed");
    return "";
  }
  char out[INET6_ADDRSTRLEN];
  if (inet_ntop(AF_INET6, &addr, out, sizeof out) == nullptr) return "";
  return out;
}

void ParseV6::operator()(char const* line, std::vector<Route>& routes) const {
  // Every column is hexadecimal; metric and flags are read as decimal on purpose: only the low
  // bits of the flags and the order of the metrics are used.
  std::istringstream in(line);
  std::string destination, nexthop, ifname, skipped;
  int metric = 0;
  int flags = 0;
  if (!(in >> destination >> skipped >> skipped >> skipped >> nexthop >> metric >> skipped >>
        skipped >> flags >> ifname)) {
    return;
  }
  if ((flags & kDefaultRouteFlags) != kDefaultRouteFlags || !AllZeros(destination)) return;
  Route route;
  route.metric = metric;
  route.gateway = formatAddress(nexthop);
  route.ifname = ifname;
  routes.push_back(route);
}

}  // namespace routeparse

namespace {

template <int family>
struct RouteParser;
template <>
struct RouteParser<AF_INET> {
  typedef routeparse::ParseV4 Type;
};
template <>
struct RouteParser<AF_INET6> {
  typedef routeparse::ParseV6 Type;
};

// The default routes of the family's route file; false when it cannot be opened.
template <int family>
bool ReadDefaultRoutes(std::vector<routeparse::Route>& routes) {
  typedef typename RouteParser<family>::Type Parser;
  FILE* fp = std::fopen(Parser::RouteFile, "re");
  if (fp == nullptr) {
    VORN_LOG(LOG_ERR, "Unable to open route file: %s", Parser::RouteFile);
    return false;
  }
  Parser parse;
  char line[1024];
  while (std::fgets(line, sizeof line, fp) != nullptr) parse(line, routes);
  std::fclose(fp);
  return true;
}

}  // namespace

template <int family>
std::string GetDefaultRoute() {
  std::vector<routeparse::Route> routes;
  if (!ReadDefaultRoutes<family>(routes) || routes.empty()) return "";
  std::stable_sort(routes.begin(), routes.end());
  return routes.front().gateway;
}

template <int family>
int GetNumDefaultRoutes() {
  std::vector<routeparse::Route> routes;
  if (!ReadDefaultRoutes<family>(routes)) return -1;
  return static_cast<int>(routes.size());
}

template std::string GetDefaultRoute<AF_INET>();
template std::string GetDefaultRoute<AF_INET6>();
template int GetNumDefaultRoutes<AF_INET>();
template int GetNumDefaultRoutes<AF_INET6>();

}  // namespace utils
}  // namespace vornwireless
