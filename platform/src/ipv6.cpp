// IPv6 settings of interfaces, IPv4 address tests and the PPPoE interface.
#include "vornplatform/ipv6.h"

#include <arpa/inet.h>
#include <linux/netlink.h>
#include <linux/rtnetlink.h>
#include <net/if.h>
#include <net/if_arp.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <sys/time.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <sstream>
#include <string>
#include <vector>

#include "vornplatform/action.h"
#include "vornplatform/err.h"
#include "vornplatform/log.h"

namespace {

bool ValidName(const char* ifname) {
  return ifname && ifname[0] && std::strlen(ifname) < IF_NAMESIZE &&
         std::strchr(ifname, '/') == nullptr && std::strcmp(ifname, ".") != 0 &&
         std::strcmp(ifname, "..") != 0;
}

void CopyText(const std::string& text, char* buf, int size) {
  if (!buf || size <= 0) return;
  std::snprintf(buf, static_cast<size_t>(size), "%s", text.c_str());
}

std::string FirstLine(const std::string& text) {
  const size_t end = text.find('\n');
  return end == std::string::npos ? text : text.substr(0, end);
}

}  // namespace

int VORNNetIPv6ConfGet(const char* ifname, int* mode, char* addr, int addrSize, int* prefix,
                       char* gateway, int gatewaySize) {
  if (!ValidName(ifname) || !mode) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  std::string out;
  if (vornplatform::RunAction("VORNNetIPv6ConfGet", {ifname}, &out) != 0) return -1;
  std::string a, g;
  int m = 0, p = 0;
  if (!out.empty()) {
    std::istringstream line(FirstLine(out));
    if (!(line >> m)) {
      VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
      return -1;
    }
    line >> a >> p >> g;
  }
  *mode = m;
  if (prefix) *prefix = p;
  CopyText(a, addr, addrSize);
  CopyText(g, gateway, gatewaySize);
  return m;
}

int VORNNetIPv6ConfSet(int mode, const char* ifname, const char* addr, int prefix,
                       const char* gateway) {
  if (!ValidName(ifname)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return vornplatform::RunStrictAction(
      "VORNNetIPv6ConfSet", {std::to_string(mode), ifname, addr ? addr : "", std::to_string(prefix),
                             gateway ? gateway : ""});
}

int VORNPPPoeIntfGet(char* buf, int size) {
  if (!buf || size <= 0) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  buf[0] = '\0';
  std::string out;
  if (vornplatform::RunAction("VORNPPPoeIntfGet", {}, &out) != 0) return -1;
  const std::string name = FirstLine(out);
  if (!ValidName(name.c_str()) || static_cast<int>(name.size()) >= size) return -1;
  CopyText(name, buf, size);
  return 0;
}

int BlVLIBIsIpAddr(const char* text) {
  in_addr addr;
  return text && inet_pton(AF_INET, text, &addr) == 1 ? 1 : 0;
}

int VORNNetIsPrivateIP(const char* ip) {
  in_addr addr;
  if (!ip || inet_pton(AF_INET, ip, &addr) != 1) return -1;
  const uint32_t a = ntohl(addr.s_addr);
  struct Net {
    uint32_t net, mask;
  } const nets[] = {{0x0A000000u, 0xFF000000u}, {0xAC100000u, 0xFFF00000u},
                    {0xC0A80000u, 0xFFFF0000u}, {0x64400000u, 0xFFC00000u},
                    {0x7F000000u, 0xFF000000u}, {0xA9FE0000u, 0xFFFF0000u}};
  for (const Net& n : nets) {
    if ((a & n.mask) == n.net) return 1;
  }
  return 0;
}

int VORNNetIsIFUp(const char* ifname) {
  if (!ValidName(ifname)) return 0;
  int fd = socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0);
  if (fd < 0) return 0;
  ifreq req;
  std::memset(&req, 0, sizeof req);
  std::snprintf(req.ifr_name, sizeof req.ifr_name, "%s", ifname);
  const int rc = ioctl(fd, SIOCGIFFLAGS, &req);
  close(fd);
  return rc == 0 && (req.ifr_flags & IFF_UP) ? 1 : 0;
}

int VORNNetIsDevTypeMatch(const char* ifname, int type) {
  if (!ValidName(ifname)) return 0;
  const std::string path = std::string("/sys/class/net/") + ifname + "/type";
  FILE* fp = std::fopen(path.c_str(), "r");
  if (!fp) return 0;
  int hw = -1;
  const int n = std::fscanf(fp, "%d", &hw);
  std::fclose(fp);
  if (n != 1) return 0;
  switch (type) {
    case VORN_DEV_TYPE_ETHERNET:
      return hw == ARPHRD_ETHER ? 1 : 0;
    case VORN_DEV_TYPE_PPP:
      return hw == ARPHRD_PPP || hw == ARPHRD_NONE || hw == ARPHRD_SIT ? 1 : 0;
    default:
      return 0;
  }
}

int VORNLnxIPv6ProcAction(const char* ifname, int action) {
  if (!ValidName(ifname) || (action != 0 && action != 1)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  const std::string path = std::string("/proc/sys/net/ipv6/conf/") + ifname + "/disable_ipv6";
  FILE* fp = std::fopen(path.c_str(), "w");
  if (!fp) {
    VLIBC_ERR_SET(VLIBC_ERR_IO);
    return -1;
  }
  const bool written = std::fprintf(fp, "%d\n", action) > 0;
  const bool closed = std::fclose(fp) == 0;
  if (!written || !closed) {
    VLIBC_ERR_SET(VLIBC_ERR_IO);
    return -1;
  }
  return 0;
}

int VORNNetSetIP(const char* family, const char* ifname, const char* address, int prefixLength,
                 const char* action) {
  if (!family || !ValidName(ifname) || !address || !action) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  const bool v6 = std::strcmp(family, "-6") == 0;
  if (!v6 && std::strcmp(family, "-4") != 0) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  const bool add = std::strcmp(action, "add") == 0;
  if (!add && std::strcmp(action, "del") != 0) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  unsigned char bin[16];
  const int af = v6 ? AF_INET6 : AF_INET;
  const int maxLength = v6 ? 128 : 32;
  if (inet_pton(af, address, bin) != 1 || prefixLength < 0 || prefixLength > maxLength) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  const unsigned int index = if_nametoindex(ifname);
  if (index == 0) {
    VLIBC_ERR_SET(VLIBC_ERR_NOT_FOUND);
    return -1;
  }
  struct {
    nlmsghdr nh;
    ifaddrmsg ifa;
    char attrs[64];
  } req;
  std::memset(&req, 0, sizeof req);
  req.nh.nlmsg_len = NLMSG_LENGTH(sizeof(ifaddrmsg));
  req.nh.nlmsg_type = add ? RTM_NEWADDR : RTM_DELADDR;
  req.nh.nlmsg_flags = NLM_F_REQUEST | NLM_F_ACK | (add ? NLM_F_CREATE | NLM_F_EXCL : 0);
  req.nh.nlmsg_seq = 1;
  req.ifa.ifa_family = static_cast<unsigned char>(af);
  req.ifa.ifa_prefixlen = static_cast<unsigned char>(prefixLength);
  req.ifa.ifa_index = index;
  const int size = v6 ? 16 : 4;
  for (unsigned short type : {static_cast<unsigned short>(IFA_LOCAL),
                              static_cast<unsigned short>(IFA_ADDRESS)}) {
    rtattr* rta = reinterpret_cast<rtattr*>(reinterpret_cast<char*>(&req) +
                                            NLMSG_ALIGN(req.nh.nlmsg_len));
    rta->rta_type = type;
    rta->rta_len = static_cast<unsigned short>(RTA_LENGTH(size));
    std::memcpy(RTA_DATA(rta), bin, static_cast<size_t>(size));
    req.nh.nlmsg_len = NLMSG_ALIGN(req.nh.nlmsg_len) + RTA_ALIGN(rta->rta_len);
  }
  int fd = socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC, NETLINK_ROUTE);
  if (fd < 0) {
    VLIBC_ERR_SET(VLIBC_ERR_IO);
    return -1;
  }
  timeval tv = {5, 0};
  setsockopt(fd, SOL_SOCKET, SO_RCVTIMEO, &tv, sizeof tv);
  sockaddr_nl kernel;
  std::memset(&kernel, 0, sizeof kernel);
  kernel.nl_family = AF_NETLINK;
  int result = -1;
  if (sendto(fd, &req, req.nh.nlmsg_len, 0, reinterpret_cast<sockaddr*>(&kernel),
             sizeof kernel) == static_cast<ssize_t>(req.nh.nlmsg_len)) {
    char reply[4096];
    const ssize_t n = recv(fd, reply, sizeof reply, 0);
    if (n >= static_cast<ssize_t>(NLMSG_LENGTH(sizeof(nlmsgerr)))) {
      nlmsghdr* h = reinterpret_cast<nlmsghdr*>(reply);
      if (h->nlmsg_type == NLMSG_ERROR) {
        nlmsgerr* err = static_cast<nlmsgerr*>(NLMSG_DATA(h));
        result = err->error == 0 ? 0 : -1;
      }
    }
  }
  close(fd);
  if (result != 0) VLIBC_ERR_SET(VLIBC_ERR_IO);
  return result;
}
