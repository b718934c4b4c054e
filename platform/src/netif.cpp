// Interface facts through the kernel's interface ioctls, sysfs and the ifcfg file.
#include "vornplatform/netif.h"

#include <arpa/inet.h>
#include <errno.h>
#include <net/if.h>
#include <netinet/in.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cstdio>
#include <cstring>
#include <string>

#include "vornplatform/err.h"
#include "vornplatform/file.h"

namespace {

const char kIfcfgDir[] = "/etc/sysconfig/network-scripts/ifcfg-";

void CopyText(char* dst, std::size_t size, const char* src) {
  std::snprintf(dst, size, "%s", src);
}

// The IPv4 address of one SIOCGIF* request as text; "" when the interface has none.
bool ReadAddress(int fd, unsigned long request, const char* ifname, char* out, std::size_t size) {
  struct ifreq ifr;
  std::memset(&ifr, 0, sizeof(ifr));
  std::snprintf(ifr.ifr_name, sizeof(ifr.ifr_name), "%s", ifname);
  ifr.ifr_addr.sa_family = AF_INET;
  out[0] = '\0';
  if (ioctl(fd, request, &ifr) != 0) return errno == EADDRNOTAVAIL;
  const struct sockaddr_in* sin = reinterpret_cast<const struct sockaddr_in*>(&ifr.ifr_addr);
  return inet_ntop(AF_INET, &sin->sin_addr, out, static_cast<socklen_t>(size)) != nullptr;
}

int ReadCarrier(const char* ifname) {
  std::string path = std::string("/sys/class/net/") + ifname + "/carrier";
  FILE* fp = std::fopen(path.c_str(), "r");
  if (fp == nullptr) return 0;
  int value = 0;
  if (std::fscanf(fp, "%d", &value) != 1) value = 0;  // an interface that is down gives EINVAL
  std::fclose(fp);
  return value == 1 ? 1 : 0;
}

// 1 found, 0 no such interface, -1 error.
int ReadLive(const char* ifname, PVORN_NETIF_INFO info) {
  std::memset(info, 0, sizeof(*info));
  int fd = socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0);
  if (fd < 0) {
    VLIBC_ERR_SET(VLIBC_ERR_IO);
    return -1;
  }
  struct ifreq ifr;
  std::memset(&ifr, 0, sizeof(ifr));
  std::snprintf(ifr.ifr_name, sizeof(ifr.ifr_name), "%s", ifname);
  if (ioctl(fd, SIOCGIFFLAGS, &ifr) != 0) {
    int err = errno;
    close(fd);
    if (err == ENODEV || err == ENXIO) {
      VLIBC_ERR_SET(VLIBC_ERR_NOT_FOUND);
      return 0;
    }
    VLIBC_ERR_SET(VLIBC_ERR_IO);
    return -1;
  }
  CopyText(info->szIfName, sizeof(info->szIfName), ifname);
  info->uFlags = static_cast<unsigned short>(ifr.ifr_flags);
  if (!ReadAddress(fd, SIOCGIFADDR, ifname, info->szIP, sizeof(info->szIP)) ||
      !ReadAddress(fd, SIOCGIFNETMASK, ifname, info->szMask, sizeof(info->szMask))) {
    close(fd);
    VLIBC_ERR_SET(VLIBC_ERR_IO);
    return -1;
  }
  if (info->szIP[0] == '\0') info->szMask[0] = '\0';
  std::memset(&ifr, 0, sizeof(ifr));
  std::snprintf(ifr.ifr_name, sizeof(ifr.ifr_name), "%s", ifname);
  if (ioctl(fd, SIOCGIFHWADDR, &ifr) == 0) std::memcpy(info->mac, ifr.ifr_hwaddr.sa_data, 6);
  close(fd);
  info->iLink = ReadCarrier(ifname);

  std::string ifcfg = std::string(kIfcfgDir) + ifname;
  char proto[64] = "";
  VLIBCFileGetKeyValue(ifcfg.c_str(), "BOOTPROTO", proto, sizeof(proto), 0);
  info->iFlag = std::strcmp(proto, "dhcp") == 0 ? VORN_NETIF_DHCP : VORN_NETIF_STATIC;
  return 1;
}

bool ValidName(const char* ifname) {
  return ifname != nullptr && ifname[0] != '\0' && std::strlen(ifname) < IFNAMSIZ &&
         std::strchr(ifname, '/') == nullptr;
}

}  // namespace

int VORNNetIFGetInfo(const char* ifname, PVORN_NETIF_INFO info, PVORN_NETIF_INFO info2) {
  if (info != nullptr) std::memset(info, 0, sizeof(*info));
  if (info2 != nullptr) std::memset(info2, 0, sizeof(*info2));
  if (!ValidName(ifname) || info == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  int ret = ReadLive(ifname, info);
  if (ret != 1) {
    std::memset(info, 0, sizeof(*info));
    return ret;
  }
  if (info2 != nullptr) {
    *info2 = *info;
    std::string ifcfg = std::string(kIfcfgDir) + ifname;
    char buf[64] = "";
    info2->szIP[0] = '\0';
    info2->szMask[0] = '\0';
    if (VLIBCFileGetKeyValue(ifcfg.c_str(), "IPADDR", buf, sizeof(buf), 0) > 0)
      CopyText(info2->szIP, sizeof(info2->szIP), buf);
    buf[0] = '\0';
    if (VLIBCFileGetKeyValue(ifcfg.c_str(), "NETMASK", buf, sizeof(buf), 0) > 0)
      CopyText(info2->szMask, sizeof(info2->szMask), buf);
  }
  return 1;
}

int VORNNetIFGetInfo_S(const char* ifname, PVORN_NETIF_INFO info) {
  if (!ValidName(ifname) || info == nullptr) {
    if (info != nullptr) std::memset(info, 0, sizeof(*info));
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  int ret = ReadLive(ifname, info);
  if (ret != 1) {
    std::memset(info, 0, sizeof(*info));
    return -1;
  }
  return 0;
}
