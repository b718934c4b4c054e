// Interface up and down through SIOCGIFFLAGS/SIOCSIFFLAGS.
#include "vornplatform/netif_updown.h"

#include <net/if.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "internal.h"

namespace {

int SetUp(const char* ifname, bool up) {
  if (!vornplatform::internal::HasText(ifname) || std::strlen(ifname) >= IFNAMSIZ) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return 0;
  }
  int fd = socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0);
  if (fd < 0) {
    VLIBC_ERR_SET(VLIBC_ERR_IO);
    return 0;
  }
  struct ifreq ifr;
  std::memset(&ifr, 0, sizeof ifr);
  std::strncpy(ifr.ifr_name, ifname, IFNAMSIZ - 1);
  int ok = 0;
  if (ioctl(fd, SIOCGIFFLAGS, &ifr) != 0) {
    VLIBC_ERR_SET(errno == ENODEV ? VLIBC_ERR_NOT_FOUND : VLIBC_ERR_IO);
  } else {
    const bool isUp = (ifr.ifr_flags & IFF_UP) != 0;
    if (isUp == up) {
      ok = 1;
    } else {
      if (up) {
        ifr.ifr_flags = static_cast<short>(ifr.ifr_flags | IFF_UP);
      } else {
        ifr.ifr_flags = static_cast<short>(ifr.ifr_flags & ~IFF_UP);
      }
      if (ioctl(fd, SIOCSIFFLAGS, &ifr) == 0) {
        ok = 1;
      } else {
        VLIBC_ERR_SET(VLIBC_ERR_IO);
      }
    }
  }
  close(fd);
  return ok;
}

}  // namespace

int VLIBNetIfUp(const char* ifname) { return SetUp(ifname, true); }
int VLIBNetIfDown(const char* ifname) { return SetUp(ifname, false); }
