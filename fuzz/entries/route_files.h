// The kernel route files: the input becomes the route file of one family and both readers of it
// run over it.
#ifndef VORN_FUZZ_ENTRIES_ROUTE_FILES_H
#define VORN_FUZZ_ENTRIES_ROUTE_FILES_H

#include <arpa/inet.h>
#include <unistd.h>

#include <cstdio>
#include <string>

#include "entries/fuzz_input.h"
#include "vornwireless/utils/get_default_route.h"

namespace vornfuzz {

// Writes the bytes to path; false on failure.
inline bool WriteWhole(std::string const& path, const uint8_t* data, size_t size) {
  FILE* f = std::fopen(path.c_str(), "we");
  if (f == nullptr) return false;
  const bool ok = std::fwrite(data, 1, size, f) == size;
  return std::fclose(f) == 0 && ok;
}

struct RouteFileAnswer {
  std::string gateway;
  int count = 0;
};

// The gateway of the lowest-metric default route and the number of default routes of a route
// file holding `text`, family AF_INET or AF_INET6.
template <int family>
RouteFileAnswer ReadRouteFile(const uint8_t* data, size_t size) {
  using namespace vornwireless::utils;
  static const std::string path = "/tmp/vorn-fuzz-route." + std::to_string(getpid());
  Require(WriteWhole(path, data, size), "the route file is written");
  if (family == AF_INET) {
    routeparse::ParseV4::RouteFile = path.c_str();
  } else {
    routeparse::ParseV6::RouteFile = path.c_str();
  }
  RouteFileAnswer a;
  a.gateway = GetDefaultRoute<family>();
  a.count = GetNumDefaultRoutes<family>();
  Require(a.count >= 0, "a route file that exists is counted");
  if (!a.gateway.empty()) {
    unsigned char buf[sizeof(in6_addr)];
    Require(inet_pton(family, a.gateway.c_str(), buf) == 1, "the gateway is an address");
    Require(a.count > 0, "a gateway comes from a default route");
  }
  return a;
}

}  // namespace vornfuzz

#endif
