// Dotted IPv4 texts: octets and the network/prefix form.
#include "vornplatform/ipaddr.h"

#include <arpa/inet.h>

#include <cctype>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>

#include "vornplatform/err.h"

int cVLIBISepIP(const char* text, unsigned int octets[4]) {
  if (text == nullptr || octets == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  int count = 0;
  const char* p = text;
  while (true) {
    const char* start = p;
    unsigned int value = 0;
    while (std::isdigit(static_cast<unsigned char>(*p)) && p - start < 3) {
      value = value * 10 + static_cast<unsigned int>(*p - '0');
      ++p;
    }
    if (p == start || value > 255 || (*p != '.' && *p != '\0')) {
      VLIBC_ERR_SET(VLIBC_ERR_FORMAT);
      return -1;
    }
    if (count < 4) octets[count] = value;
    ++count;
    if (*p == '\0') break;
    ++p;
  }
  return count;
}

int ErrVLIBIpMaskToSubnet(const char* ipmask, char* out) {
  if (ipmask == nullptr || out == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  out[0] = '\0';
  const char* slash = std::strchr(ipmask, '/');
  if (slash == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_FORMAT);
    return -1;
  }
  std::string ip(ipmask, static_cast<std::size_t>(slash - ipmask));
  std::string mask(slash + 1);
  struct in_addr addr;
  if (inet_pton(AF_INET, ip.c_str(), &addr) != 1 || mask.empty()) {
    VLIBC_ERR_SET(VLIBC_ERR_FORMAT);
    return -1;
  }
  int prefix = -1;
  if (mask.find('.') == std::string::npos) {
    if (mask.size() > 2 || mask.find_first_not_of("0123456789") != std::string::npos) {
      VLIBC_ERR_SET(VLIBC_ERR_FORMAT);
      return -1;
    }
    prefix = std::atoi(mask.c_str());
    if (prefix > 32) {
      VLIBC_ERR_SET(VLIBC_ERR_FORMAT);
      return -1;
    }
  } else {
    struct in_addr m;
    if (inet_pton(AF_INET, mask.c_str(), &m) != 1) {
      VLIBC_ERR_SET(VLIBC_ERR_FORMAT);
      return -1;
    }
    uint32_t bits = ntohl(m.s_addr);
    uint32_t inverted = ~bits;
    if ((inverted & (inverted + 1)) != 0) {  // not contiguous
      VLIBC_ERR_SET(VLIBC_ERR_FORMAT);
      return -1;
    }
    prefix = __builtin_popcount(bits);
  }
  uint32_t netmask = prefix == 0 ? 0 : (0xffffffffu << (32 - prefix));
  struct in_addr network;
  network.s_addr = htonl(ntohl(addr.s_addr) & netmask);
  char text[INET_ADDRSTRLEN];
  if (inet_ntop(AF_INET, &network, text, sizeof(text)) == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_FORMAT);
    return -1;
  }
  std::snprintf(out, 32, "%s/%d", text, prefix);
  return 0;
}
