// RAs built byte by byte for the router advertisement watch's tests.
#ifndef VORN_TESTS_UNIT_NETWORK_IPV6_SUPPORT_H
#define VORN_TESTS_UNIT_NETWORK_IPV6_SUPPORT_H

#include <arpa/inet.h>

#include <cstring>
#include <string>
#include <vector>

namespace ipv6test {

typedef std::vector<unsigned char> Bytes;

// A prefix information option: length 4 (32 bytes), prefix length 64, flags (0xc0 = on-link and
// autonomous), lifetimes 86400 and 14400.
inline Bytes PrefixOption(const std::string& prefix, unsigned char flags = 0xc0) {
  Bytes o = {3, 4, 64, flags, 0x00, 0x01, 0x51, 0x80, 0x00, 0x00, 0x38, 0x40, 0, 0, 0, 0};
  unsigned char addr[16];
  inet_pton(AF_INET6, prefix.c_str(), addr);
  o.insert(o.end(), addr, addr + 16);
  return o;
}

// A source link-layer address option (type 1, 8 bytes).
inline Bytes SourceLinkOption() { return {1, 1, 0x02, 0x00, 0x00, 0x00, 0x00, 0x01}; }

// A router advertisement: header of 16 bytes (hop limit 64, lifetime 1800) and the options.
inline Bytes Ra(bool managed, bool other, const std::vector<Bytes>& options = {}) {
  Bytes ra = {134, 0, 0, 0, 64, static_cast<unsigned char>((managed ? 0x80 : 0) | (other ? 0x40 : 0)),
              0x07, 0x08, 0, 0, 0, 0, 0, 0, 0, 0};
  for (const Bytes& o : options) ra.insert(ra.end(), o.begin(), o.end());
  return ra;
}

}  // namespace ipv6test

#endif
