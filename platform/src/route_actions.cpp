// The interface address for the default route's source, and the platform actions of the route
// module: high-availability state, gateway and DNS change hooks, resolver update.
#include "vornplatform/route_actions.h"

#include <arpa/inet.h>
#include <net/if.h>
#include <netinet/in.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

#include "internal.h"
#include "vornplatform/action.h"
#include "vornplatform/err.h"
#include "vornplatform/log.h"

using vornplatform::internal::HasText;
using vornplatform::internal::NoThrow;

namespace {

bool ValidIfName(const char* ifname) {
  return HasText(ifname) && std::strlen(ifname) < IFNAMSIZ && std::strchr(ifname, '/') == nullptr;
}

const char* Text(const char* s) { return s != nullptr ? s : ""; }

// The first line of an action's stdout, without the line break and trailing blanks.
std::string FirstLine(const std::string& out) {
  std::string line = out.substr(0, out.find('\n'));
  while (!line.empty() && (line.back() == '\r' || line.back() == ' ' || line.back() == '\t')) {
    line.pop_back();
  }
  return line;
}

}  // namespace

int VORNILnxGetIP(const char* ifname, char* buf, int size) {
  if (buf == nullptr || size <= 0) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  buf[0] = '\0';
  if (!ValidIfName(ifname)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  const int fd = socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0);
  if (fd < 0) {
    VLIBC_ERR_SET(VLIBC_ERR_IO);
    return -1;
  }
  struct ifreq ifr;
  std::memset(&ifr, 0, sizeof ifr);
  std::snprintf(ifr.ifr_name, sizeof ifr.ifr_name, "%s", ifname);
  ifr.ifr_addr.sa_family = AF_INET;
  const int rc = ioctl(fd, SIOCGIFADDR, &ifr);
  const int saved = errno;
  close(fd);
  if (rc != 0) {
    errno = saved;
    VLIBC_ERR_SET(saved == ENODEV ? VLIBC_ERR_NOT_FOUND : VLIBC_ERR_IO);
    return -1;
  }
  struct sockaddr_in sin;
  std::memcpy(&sin, &ifr.ifr_addr, sizeof sin);
  char text[INET_ADDRSTRLEN] = "";
  if (inet_ntop(AF_INET, &sin.sin_addr, text, sizeof text) == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_FORMAT);
    return -1;
  }
  if (std::strlen(text) >= static_cast<size_t>(size)) {
    VLIBC_ERR_SET(VLIBC_ERR_TOO_LONG);
    return -1;
  }
  std::snprintf(buf, size, "%s", text);
  return 0;
}

int VORNHAIsRunning() {
  return NoThrow(0, []() -> int {
    std::string out;
    if (vornplatform::RunAction("VORNHAIsRunning", {}, &out) != 0) return 0;
    return FirstLine(out) == "1" ? 1 : 0;
  });
}

int VORNHAGetHeartbeatIF(char* buf, int size) {
  if (buf == nullptr || size <= 0) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  buf[0] = '\0';
  return NoThrow(-1, [&]() -> int {
    std::string out;
    const int rc = vornplatform::RunAction("VORNHAGetHeartbeatIF", {}, &out);
    if (rc != 0) {
      if (rc > 0) {
        VORN_LOG(LOG_ERR, "platform action %s exited with %d", "VORNHAGetHeartbeatIF", rc);
        VLIBC_ERR_SET(VLIBC_ERR_EXEC);
      }
      return -1;
    }
    const std::string name = FirstLine(out);
    if (name.size() >= static_cast<size_t>(size)) {
      VLIBC_ERR_SET(VLIBC_ERR_TOO_LONG);
      return -1;
    }
    std::snprintf(buf, size, "%s", name.c_str());
    return 0;
  });
}

int VORNNetGatewayConfigChangeHook(int stage, const char* family, const char* ifname,
                                   const char* oldGateway, const char* newGateway) {
  return NoThrow(-1, [&]() -> int {
    return vornplatform::RunStrictAction(
        "VORNNetGatewayConfigChangeHook",
        {std::to_string(stage), Text(family), Text(ifname), Text(oldGateway), Text(newGateway)});
  });
}

int VORNNetDnsConfigChangeHook(int stage, const char* ifname, PVLIBSZLIST dnsList) {
  return NoThrow(-1, [&]() -> int {
    std::vector<std::string> args{std::to_string(stage), Text(ifname)};
    const int count = dnsList != nullptr ? VLIBCSzListCount(dnsList) : 0;
    for (int i = 0; i < count; ++i) args.push_back(Text(VLIBCSzListGet(dnsList, i)));
    return vornplatform::RunStrictAction("VORNNetDnsConfigChangeHook", args);
  });
}

namespace vornnetsdk {
namespace sdk_s {

int VORNNetDNSUpdate_S() {
  return NoThrow(-1, []() -> int { return vornplatform::RunStrictAction("VORNNetDNSUpdate", {}); });
}

}  // namespace sdk_s
}  // namespace vornnetsdk
