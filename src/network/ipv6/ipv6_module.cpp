// The router advertisement watch. The watch thread is the only user of the socket; the context
// map is shared with ResetIPv6Module on the D-Bus thread under _contextMutex, which an RA holds
// from its first look at the map to its last write, except while ndisc6 runs.
#include "vornwireless/network/ipv6/ipv6_module.h"

#include <arpa/inet.h>
#include <fcntl.h>
#include <net/if.h>
#include <netinet/icmp6.h>
#include <sys/select.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <cmath>
#include <cstdlib>
#include <cstring>
#include <exception>

#include "vornplatform/file.h"
#include "vornplatform/ipv6.h"
#include "vornplatform/log.h"
#include "vornplatform/proc.h"
#include "vornwireless/network/module_manager.h"

namespace vornnetwork {
namespace network {
namespace module {

namespace {

const char kIfcfgPrefix[] = "/etc/sysconfig/network-scripts/ifcfg-";
const char kNdisc6[] = "/usr/bin/ndisc6";
const char kLanBridge[] = "lbr0";
const int kTypeRouterSolicitation = 133;
const int kTypeRouterAdvertisement = 134;
const int kOptionPrefixInformation = 3;
const int kPrefixOptionLength = 32;
const unsigned char kAutonomousFlag = 0x40;
const int kGatewayPriorityKeep = -2;

// The process-wide control message buffer of recv_rs_ra, allocated at first use and kept.
unsigned char* g_controlBuffer = nullptr;
std::size_t g_controlBufferSize = 0;

}  // namespace

IPv6Module::IPv6Module()
    : BaseModule(MODULE_IPV6), _icmpv6Socket(-1), _thread(), _threadStarted(false), _stopping(false) {
  _wakePipe[0] = _wakePipe[1] = -1;
}

IPv6Module::~IPv6Module() {
  // A module deleted without Terminate must not leave its thread running on a dead object.
  if (_threadStarted || _icmpv6Socket >= 0) IPv6Module::TerminateModule();
}

BaseModule* IPv6Module::Create() { return new IPv6Module(); }

int IPv6Module::ProcessRequest(Json::Value const& request, Json::Value&) {
  try {
    if (!request.isObject() || !request["method"].isString() ||
        request["method"].asString() != "RESET_IPV6_MODULE") {
      return 0;
    }
    const std::string ifname = request["ifname"].isString() ? request["ifname"].asString() : "";
    std::lock_guard<std::recursive_mutex> lock(_contextMutex);
    _contexts.erase(ifname);
  } catch (std::exception const& e) {
    VORN_LOG(LOG_ERR, "Failed to handle request: %s", e.what());
  }
  return 0;
}

bool IPv6Module::open_icmpv6_socket(int& fd) {
  fd = socket(AF_INET6, SOCK_RAW | SOCK_CLOEXEC, IPPROTO_ICMPV6);
  if (fd < 0) {
    VORN_LOG(LOG_ERR, "Failed to create socket(AF_INET6)");
    return false;
  }
  int on = 1;
  int hops = 255;
  const char* failed = nullptr;
  if (setsockopt(fd, IPPROTO_IPV6, IPV6_RECVPKTINFO, &on, sizeof on) != 0) {
    failed = "Failed to setsockopt(IPV6_RECVPKTINFO)";
  } else if (setsockopt(fd, IPPROTO_IPV6, IPV6_UNICAST_HOPS, &hops, sizeof hops) != 0) {
    failed = "Failed to setsockopt(IPV6_UNICAST_HOPS)";
  } else if (setsockopt(fd, IPPROTO_IPV6, IPV6_MULTICAST_HOPS, &hops, sizeof hops) != 0) {
    failed = "Failed to setsockopt(IPV6_MULTICAST_HOPS)";
  } else {
    icmp6_filter filter;
    ICMP6_FILTER_SETBLOCKALL(&filter);
    ICMP6_FILTER_SETPASS(kTypeRouterSolicitation, &filter);
    ICMP6_FILTER_SETPASS(kTypeRouterAdvertisement, &filter);
    if (setsockopt(fd, IPPROTO_ICMPV6, ICMP6_FILTER, &filter, sizeof filter) != 0) {
      failed = "Failed to setsockopt(ICMP6_FILTER)";
    }
  }
  if (failed) {
    VORN_LOG(LOG_ERR, "%s", failed);
    close(fd);
    fd = -1;
    return false;
  }
  return true;
}

int IPv6Module::recv_rs_ra(int fd, int wakeFd, unsigned char* buffer, sockaddr_in6* sender,
                           in6_pktinfo** info) {
  if (!g_controlBuffer) {
    g_controlBufferSize = CMSG_SPACE(sizeof(in6_pktinfo));
    g_controlBuffer = static_cast<unsigned char*>(std::malloc(g_controlBufferSize));
    if (!g_controlBuffer) {
      g_controlBufferSize = 0;
      VORN_LOG(LOG_ERR, "Failed to malloc chdr");
      return -1;
    }
  }
  *info = nullptr;
  fd_set readable;
  FD_ZERO(&readable);
  FD_SET(fd, &readable);
  int maxFd = fd;
  if (wakeFd >= 0) {
    FD_SET(wakeFd, &readable);
    if (wakeFd > maxFd) maxFd = wakeFd;
  }
  if (select(maxFd + 1, &readable, nullptr, nullptr, nullptr) < 0) {
    VORN_LOG(LOG_ERR, "Failed to select socket");
    return -1;
  }
  if (wakeFd >= 0 && FD_ISSET(wakeFd, &readable)) return -1;

  iovec iov;
  iov.iov_base = buffer;
  iov.iov_len = kPacketBufferSize;
  msghdr message;
  std::memset(&message, 0, sizeof message);
  message.msg_name = sender;
  message.msg_namelen = sizeof(sockaddr_in6);
  message.msg_iov = &iov;
  message.msg_iovlen = 1;
  message.msg_control = g_controlBuffer;
  message.msg_controllen = g_controlBufferSize;
  const ssize_t length = recvmsg(fd, &message, 0);
  if (length < 0) {
    VORN_LOG(LOG_ERR, "Failed to receive message");
    return -1;
  }
  for (cmsghdr* c = CMSG_FIRSTHDR(&message); c != nullptr; c = CMSG_NXTHDR(&message, c)) {
    if (c->cmsg_level != IPPROTO_IPV6 || c->cmsg_type != IPV6_PKTINFO) continue;
    in6_pktinfo* pktinfo = reinterpret_cast<in6_pktinfo*>(CMSG_DATA(c));
    const unsigned int index = c->cmsg_len == CMSG_LEN(sizeof(in6_pktinfo))
                                   ? pktinfo->ipi6_ifindex
                                   : 0;
    if (c->cmsg_len != CMSG_LEN(sizeof(in6_pktinfo)) || index == 0) {
      VORN_LOG(LOG_ERR, "received a bogus IPV6_PKTINFO from the kernel! len=%d, index=%u\n",
               static_cast<int>(c->cmsg_len), index);
      return -1;
    }
    *info = pktinfo;
  }
  return static_cast<int>(length);
}

int IPv6Module::print_addr(in6_addr* address, char* text) {
  if (inet_ntop(AF_INET6, address, text, INET6_ADDRSTRLEN) == nullptr) {
    VORN_LOG(LOG_ERR, "print_addr: failed to inet_ntop");
    return -1;
  }
  return 0;
}

int IPv6Module::InitialModule() {
  if (_icmpv6Socket >= 0) return 0;
  if (!open_icmpv6_socket(_icmpv6Socket)) {
    VORN_LOG(LOG_ERR, "Failed to open icmpv6 socket");
    return -1;
  }
  return 0;
}

int IPv6Module::StartModule() {
  if (_threadStarted) return 0;
  if (pipe2(_wakePipe, O_CLOEXEC) != 0) {
    _wakePipe[0] = _wakePipe[1] = -1;
    VORN_LOG(LOG_ERR, "Failed to create ipv6 polling thread");
    return 0;
  }
  _stopping.store(false);
  if (pthread_create(&_thread, nullptr, &IPv6Module::WatchThread, this) != 0) {
    VORN_LOG(LOG_ERR, "Failed to create ipv6 polling thread");
    close(_wakePipe[0]);
    close(_wakePipe[1]);
    _wakePipe[0] = _wakePipe[1] = -1;
    return 0;
  }
  _threadStarted = true;
  return 0;
}

int IPv6Module::TerminateModule() {
  if (_threadStarted) {
    // The thread ends at its next wait; an RA in progress (ndisc6 included) is finished first.
    _stopping.store(true);
    const char stop = 'q';
    if (write(_wakePipe[1], &stop, 1) != 1) {
      VORN_LOG(LOG_ERR, "Failed to wake the ipv6 polling thread");
    }
    if (pthread_join(_thread, nullptr) != 0) {
      VORN_LOG(LOG_ERR, "Failed to join the ipv6 polling thread");
    }
    _threadStarted = false;
  }
  for (int i = 0; i < 2; ++i) {
    if (_wakePipe[i] >= 0) close(_wakePipe[i]);
    _wakePipe[i] = -1;
  }
  if (_icmpv6Socket != -1) {
    close(_icmpv6Socket);
    _icmpv6Socket = -1;
  }
  return 0;
}

void* IPv6Module::WatchThread(void* arg) {
  try {
    static_cast<IPv6Module*>(arg)->Watch();
  } catch (std::exception const& e) {
    VORN_LOG(LOG_ERR, "ipv6 polling thread ended: %s", e.what());
  } catch (...) {
    VORN_LOG(LOG_ERR, "ipv6 polling thread ended");
  }
  return nullptr;
}

void IPv6Module::Watch() {
  unsigned char buffer[kPacketBufferSize];
  for (;;) {
    sockaddr_in6 sender;
    std::memset(&sender, 0, sizeof sender);
    in6_pktinfo* info = nullptr;
    const int length = recv_rs_ra(_icmpv6Socket, _wakePipe[0], buffer, &sender, &info);
    if (_stopping.load()) return;
    if (length == 0) {
      VORN_LOG(LOG_ERR, "received zero lenght packet");
      continue;
    }
    if (length < 0) {
      VORN_LOG(LOG_ERR, "recv_rs_ra error");
      // A socket that keeps failing (closed under us) must not spin.
      usleep(100000);
      continue;
    }
    if (!info) {
      VORN_LOG(LOG_DEBUG, "Drop a packet without packet information");
      continue;
    }
    char name[IF_NAMESIZE + 1] = "";
    if (if_indextoname(info->ipi6_ifindex, name) == nullptr) {
      VORN_LOG(LOG_DEBUG, "Drop a packet of the vanished interface %u", info->ipi6_ifindex);
      continue;
    }
    HandlePacket(buffer, length, sender, name);
  }
}

void IPv6Module::HandlePacket(unsigned char const* packet, int length, sockaddr_in6 const& sender,
                              std::string const& ifname) {
  if (length < 1) return;
  const int type = packet[0];
  if (type != kTypeRouterSolicitation && type != kTypeRouterAdvertisement) {
    VORN_LOG(LOG_ERR, "icmpv6 filter failed");
    return;
  }
  if (type == kTypeRouterSolicitation) return;
  if (length < kRaHeaderLength) {
    VORN_LOG(LOG_DEBUG, "Drop a router advertisement of %d bytes on [%s]", length,
             ifname.c_str());
    return;
  }
  char text[INET6_ADDRSTRLEN] = "";
  in6_addr address = sender.sin6_addr;
  if (print_addr(&address, text) != 0) {
    std::snprintf(text, sizeof text, "%s", "[invalid address]");
  }
  const bool managed = (packet[5] & 0x80) != 0;
  const bool other = (packet[5] & 0x40) != 0;
  ProcessRA(text, ifname, packet, length, managed, other);
}

bool IPv6Module::Ipv6Enable(std::string const& ifname) {
  int mode = 0;
  int prefix = 0;
  char address[256] = "";
  char gateway[256] = "";
  if (VORNNetIPv6ConfGet(ifname.c_str(), &mode, address, sizeof address, &prefix, gateway,
                         sizeof gateway) == -1) {
    VORN_LOG(LOG_ERR, "Fail to get ipv6 config(%s)", ifname.c_str());
    return false;
  }
  const std::string path = kIfcfgPrefix + ifname;
  char value[1024] = "";
  if (VLIBCFileGetKeyValue(path.c_str(), "IPV6ROUTER", value, sizeof value, 0) < 0) {
    VORN_LOG(LOG_DEBUG, "Failed to get key [%s] in [%s], treated as NOT a router", "IPV6ROUTER",
             path.c_str());
    value[0] = '\0';
  }
  // An interface of the unit's own router role must not follow other routers.
  return mode != VORN_IPV6_MODE_STATIC && mode != VORN_IPV6_MODE_OFF &&
         std::strncmp(value, "yes", 3) != 0 && ifname != kLanBridge;
}

bool IPv6Module::IsRaStateChange(std::string const& ifname, bool managed, bool other) {
  const int state = GetContext(ifname).state;
  switch (state) {
    case RA_STATE_MANAGED:
      return !managed;
    case RA_STATE_STATELESS:
      return managed || other;
    case RA_STATE_STATELESS_OTHER:
      return !(!managed && other);
    default:
      return true;
  }
}

bool IPv6Module::IsGatewayReachable(std::string const& ifname) {
  const std::string gateway = GetContext(ifname).gateway;
  // With no gateway there is nobody to ask.
  if (gateway.empty()) return false;
  FILE* fp = VLIBCPopen(kNdisc6, "r", gateway.c_str(), ifname.c_str(), nullptr);
  if (!fp) return false;
  char line[512];
  bool reachable = false;
  while (std::fgets(line, sizeof line, fp) != nullptr) {
    if (std::strstr(line, "Target link-layer address") != nullptr) {
      reachable = true;
      break;
    }
  }
  VLIBCPclose(fp);
  return reachable;
}

bool IPv6Module::IsRaExchangeable(std::string const& ifname) {
  const double seconds = std::fabs(difftime(Now(), GetContext(ifname).lastRaTime));
  VORN_LOG(LOG_INFO, "difftime = %f", seconds);
  return seconds > kRaExchangeSeconds;
}

std::vector<std::string> IPv6Module::RaAutoPrefixGet(unsigned char const* ra, int length,
                                                     char const* ifname) {
  std::vector<std::string> prefixes;
  if (!ra || length < kRaHeaderLength) return prefixes;
  int offset = kRaHeaderLength;
  while (offset < length) {
    const int remaining = length - offset;
    if (remaining < 2) {
      VORN_LOG(LOG_DEBUG, "Truncated option header in RA on [%s]", ifname ? ifname : "");
      break;
    }
    const int type = ra[offset];
    const int optlen = ra[offset + 1] * 8;
    if (optlen == 0) {
      VORN_LOG(LOG_ERR, "zero length option in RA");
      break;
    }
    if (optlen > remaining) {
      VORN_LOG(LOG_ERR, "option length greater than total length in RA (type %d, optlen %d, len %d)",
               type, optlen, remaining);
      break;
    }
    if (type == kOptionPrefixInformation) {
      if (optlen < kPrefixOptionLength) {
        VORN_LOG(LOG_DEBUG, "Drop a prefix option of %d bytes in RA on [%s]", optlen,
                 ifname ? ifname : "");
      } else if (ra[offset + 3] & kAutonomousFlag) {
        in6_addr prefix;
        std::memcpy(&prefix, ra + offset + 16, sizeof prefix);
        char text[INET6_ADDRSTRLEN] = "";
        if (print_addr(&prefix, text) == 0) prefixes.push_back(text);
      }
    }
    offset += optlen;
  }
  return prefixes;
}

bool IPv6Module::IsRaValid(unsigned char const* ra, int length, std::string const& ifname,
                           bool managed) {
  if (!managed && RaAutoPrefixGet(ra, length, ifname.c_str()).empty()) {
    VORN_LOG(LOG_INFO, "Ignore stateless RA which has no prefix information.");
    return false;
  }
  return true;
}

InterfaceContext IPv6Module::GetContext(std::string const& ifname, bool* exists) const {
  std::lock_guard<std::recursive_mutex> lock(_contextMutex);
  std::map<std::string, InterfaceContext>::const_iterator it = _contexts.find(ifname);
  if (exists) *exists = it != _contexts.end();
  return it == _contexts.end() ? InterfaceContext() : it->second;
}

void IPv6Module::ProcessRA(std::string const& gateway, std::string const& ifname,
                           unsigned char const* ra, int length, bool managed, bool other) {
  std::unique_lock<std::recursive_mutex> lock(_contextMutex);
  VORN_LOG(LOG_INFO, "Process RA from [%s] on interface [%s]", gateway.c_str(), ifname.c_str());
  if (!Ipv6Enable(ifname) || !IsRaValid(ra, length, ifname, managed)) {
    _contexts[ifname] = InterfaceContext("", 0, RA_STATE_NONE);
    return;
  }
  InterfaceContext& context = _contexts[ifname];
  if (context.gateway == gateway) {
    context.lastRaTime = Now();
    if (!IsRaStateChange(ifname, managed, other)) {
      VORN_LOG(LOG_INFO, "State [%d] does not change.", context.state);
      return;
    }
  } else {
    // ndisc6 may take seconds: ResetIPv6Module does not wait for it. A reset meanwhile leaves no
    // context, whose RA time of 0 lets the new router in.
    lock.unlock();
    const bool reachable = IsGatewayReachable(ifname);
    lock.lock();
    if (reachable && !IsRaExchangeable(ifname)) {
      VORN_LOG(LOG_INFO, "Original gateway [%s] reachable.", GetContext(ifname).gateway.c_str());
      return;
    }
    _contexts[ifname] = InterfaceContext("", Now(), RA_STATE_NONE);
  }
  InterfaceContext& current = _contexts[ifname];
  current.gateway = gateway;

  Json::Value request(Json::objectValue);
  request["type"] = "GTYPE_V6";
  request["priority"] = kGatewayPriorityKeep;
  request["ifname"] = ifname;
  request["gateway"] = gateway;
  request["dns"] = "NULL";
  request["method"] = "ADD_GATEWAY_DATA";
  Json::Value response;
  if (ModuleManager::GetInstance().ProcessRequest(MODULE_ROUTE, request, response) != 0) {
    VORN_LOG(LOG_ERR, "Failed to add gateway data ifname=%s, gateway=%s", ifname.c_str(),
             gateway.c_str());
  }

  int mode = VORN_IPV6_MODE_STATELESS;
  if (managed) {
    current.state = RA_STATE_MANAGED;
    mode = VORN_IPV6_MODE_MANAGED;
  } else if (other) {
    current.state = RA_STATE_STATELESS_OTHER;
    mode = VORN_IPV6_MODE_STATELESS_DHCP;
  } else {
    current.state = RA_STATE_STATELESS;
    mode = VORN_IPV6_MODE_STATELESS;
  }
  VORNNetIPv6ConfSet(mode, ifname.c_str(), nullptr, 0, nullptr);
}

}  // namespace module
}  // namespace network
}  // namespace vornnetwork
