// IP address values, IPv4 subnet arithmetic and the addresses of an interface.
#include "vornwireless/utils/ip_address.h"

#include <arpa/inet.h>
#include <ifaddrs.h>
#include <netinet/in.h>
#include <sys/socket.h>

#include <cstdio>
#include <cstring>

#include "vornplatform/ipaddr.h"
#include "vornplatform/log.h"

namespace vornwireless {
namespace utils {

namespace {

const char kOne[] = "0.0.0.1";

int CountBits(unsigned char byte) { return __builtin_popcount(byte); }

// The IPv4 or IPv6 entries of one interface; network ANDs the netmask into the address first.
IPAddress::AddressList Query(std::string const& ifname, int family, bool network) {
  IPAddress::AddressList result;
  struct ifaddrs* list = nullptr;
  if (getifaddrs(&list) != 0) {
    VORN_LOG(LOG_ERR, "Unable to get IP of [%s]", ifname.c_str());
    return result;
  }
  for (struct ifaddrs* entry = list; entry != nullptr; entry = entry->ifa_next) {
    if (entry->ifa_name == nullptr || ifname != entry->ifa_name) continue;
    if (entry->ifa_addr == nullptr || entry->ifa_addr->sa_family != family) continue;
    char text[INET6_ADDRSTRLEN] = "";
    int prefix = 0;
    char const* converted = nullptr;
    if (family == AF_INET) {
      struct in_addr addr = reinterpret_cast<struct sockaddr_in*>(entry->ifa_addr)->sin_addr;
      struct in_addr mask;
      mask.s_addr = 0;
      if (entry->ifa_netmask != nullptr) {
        mask = reinterpret_cast<struct sockaddr_in*>(entry->ifa_netmask)->sin_addr;
      }
      if (network) addr.s_addr &= mask.s_addr;
      prefix = __builtin_popcount(mask.s_addr);
      converted = inet_ntop(AF_INET, &addr, text, sizeof(text));
    } else {
      struct in6_addr addr = reinterpret_cast<struct sockaddr_in6*>(entry->ifa_addr)->sin6_addr;
      struct in6_addr mask;
      std::memset(&mask, 0, sizeof(mask));
      if (entry->ifa_netmask != nullptr) {
        mask = reinterpret_cast<struct sockaddr_in6*>(entry->ifa_netmask)->sin6_addr;
      }
      if (network) {
        for (int i = 0; i < 16; ++i) addr.s6_addr[i] &= mask.s6_addr[i];
      }
      for (int i = 0; i < 16; ++i) {
        prefix += CountBits(mask.s6_addr[i]);
        if (mask.s6_addr[i] != 0xff) break;
      }
      converted = inet_ntop(AF_INET6, &addr, text, sizeof(text));
    }
    if (converted == nullptr || text[0] == '\0') {
      VORN_LOG(LOG_WARNING, "Unable to convert address/network to text form");
      continue;
    }
    result.push_back(std::make_pair(std::string(text), prefix));
  }
  freeifaddrs(list);
  return result;
}

}  // namespace

IPAddress::IPAddress() { _addr.s_addr = 0xffffffffu; }

IPAddress::IPAddress(std::string const& text) {
  _addr.s_addr = 0xffffffffu;
  *this = text;
}

IPAddress& IPAddress::operator=(std::string const& text) {
  struct in6_addr scratch;
  if (inet_aton(text.c_str(), &_addr) != 0 || inet_pton(AF_INET6, text.c_str(), &scratch) == 1) {
    _text = text;
  } else {
    _text.clear();
  }
  return *this;
}

void IPAddress::SetInAddr(in_addr addr) {
  _addr = addr;
  _text = inet_ntoa(addr);
}

IPAddress::AddressList IPAddress::GetIPv4Address(std::string const& ifname) {
  return Query(ifname, AF_INET, false);
}

IPAddress::AddressList IPAddress::GetIPv4Network(std::string const& ifname) {
  return Query(ifname, AF_INET, true);
}

IPAddress::AddressList IPAddress::GetIPv6Address(std::string const& ifname) {
  return Query(ifname, AF_INET6, false);
}

IPAddress::AddressList IPAddress::GetIPv6Network(std::string const& ifname) {
  return Query(ifname, AF_INET6, true);
}

std::string IPAddress::GetIPv6NetworkPart(std::string const& address, int prefixLength) {
  if (prefixLength < 0) prefixLength = 0;
  if (prefixLength > 128) prefixLength = 128;
  unsigned char mask[16];
  std::memset(mask, 0, sizeof(mask));
  int full = prefixLength / 8;
  std::memset(mask, 0xff, static_cast<std::size_t>(full));
  if (full < 16) mask[full] = static_cast<unsigned char>(0xff00u >> (prefixLength % 8));
  struct in6_addr addr;
  if (inet_pton(AF_INET6, address.c_str(), &addr) != 1) {
    VORN_LOG(LOG_ERR, "Unable to convert %s to binary form", address.c_str());
    return std::string();
  }
  for (int i = 0; i < 16; ++i) addr.s6_addr[i] &= mask[i];
  char text[INET6_ADDRSTRLEN] = "";
  if (inet_ntop(AF_INET6, &addr, text, sizeof(text)) == nullptr) return std::string();
  return text;
}

std::istream& operator>>(std::istream& in, IPAddress& address) {
  std::string word;
  in >> word;
  address = word;
  return in;
}

IPAddress GetNetwork(IPAddress const& ip, IPAddress const& mask) {
  struct in_addr result;
  result.s_addr = ip.GetInAddr().s_addr & mask.GetInAddr().s_addr;
  IPAddress network;
  network.SetInAddr(result);
  return network;
}

IPAddress GetIpAddressBegin(IPAddress const& network, IPAddress const& mask) {
  (void)mask;
  struct in_addr one;
  if (inet_aton(kOne, &one) == 0) {
    VORN_LOG(LOG_ERR, "Invalid address (%s)", kOne);
    return IPAddress();
  }
  struct in_addr result;
  result.s_addr = network.GetInAddr().s_addr + one.s_addr;
  IPAddress begin;
  begin.SetInAddr(result);
  return begin;
}

IPAddress GetIpAddressEnd(IPAddress const& network, IPAddress const& mask) {
  struct in_addr one;
  if (inet_aton(kOne, &one) == 0) {
    VORN_LOG(LOG_ERR, "Invalid address (%s)", kOne);
    return IPAddress();
  }
  struct in_addr result;
  result.s_addr = ((~mask.GetInAddr().s_addr) - one.s_addr) | network.GetInAddr().s_addr;
  IPAddress end;
  end.SetInAddr(result);
  return end;
}

IPAddress GetNextNetwork(IPAddress const& network, IPAddress const& mask) {
  unsigned int n[4];
  unsigned int m[4];
  if (cVLIBISepIP(network.ToCString(), n) != 4 || cVLIBISepIP(mask.ToCString(), m) != 4) {
    return IPAddress();
  }
  uint32_t net = (n[0] << 24) | (n[1] << 16) | (n[2] << 8) | n[3];
  uint32_t msk = (m[0] << 24) | (m[1] << 16) | (m[2] << 8) | m[3];
  uint32_t next = (net - msk) & msk;
  char text[32];
  std::snprintf(text, sizeof(text), "%u.%u.%u.%u", next >> 24, (next >> 16) & 0xff,
                (next >> 8) & 0xff, next & 0xff);
  return IPAddress(std::string(text));
}

}  // namespace utils
}  // namespace vornwireless
