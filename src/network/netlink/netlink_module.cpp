// The kernel link watcher: link, address and main-table route messages become link events and
// hooks. The polling thread is the only one that touches the socket and the maps.
#include "vornwireless/network/netlink/netlink_module.h"

#include <arpa/inet.h>
#include <linux/rtnetlink.h>
#include <net/if.h>
#include <sys/select.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <exception>
#include <memory>

#if defined(__SANITIZE_ADDRESS__)
#include <sanitizer/asan_interface.h>
#endif

#include "vornplatform/err.h"
#include "vornplatform/file.h"
#include "vornplatform/log.h"
#include "vornplatform/netif.h"
#include "vornplatform/netif_events.h"
#include "vornplatform/netif_link.h"
#include "vornplatform/str.h"
#include "vornplatform/szhash.h"
#include "vornwireless/hook/gateway_change_hook.h"
#include "vornwireless/hook/ip_change_event.h"
#include "vornwireless/utils/net_link_flag.h"
#include "vornwireless/utils/parse_rtattr.h"
#include "vornwireless/utils/string_container.h"

namespace vornnetwork {
namespace network {
namespace module {

namespace {

const char kIfcfgPrefix[] = "/etc/sysconfig/network-scripts/ifcfg-";
const char kOVSBondFlagFormat[] = "/tmp/ovs_bond_hook_flag_%s";
const int kPollSeconds = 6;
const int kRecvBufferSize = 4096;
// Receive buffer of the socket (the kernel doubles it for its own bookkeeping).
const int kSocketBufferBytes = 4 * 1024 * 1024;
const int kInterfaceCapacity = 32;
const int kInterfaceKind = 3;
const int kGatewayHookAction = 5;
const unsigned int kRunningWithoutLowerUpMask = 0x10040;  // IFF_LOWER_UP | IFF_RUNNING

// Cancellation unwinds the polling thread's frames without the address sanitizer's knowledge, so
// their poisoned red zones would outlive them; in such builds this guard clears them on the way
// out. It does nothing otherwise.
struct UnwindGuard {
  UnwindGuard() = default;
  UnwindGuard(UnwindGuard const&) = delete;
  UnwindGuard& operator=(UnwindGuard const&) = delete;
  ~UnwindGuard() {
#if defined(__SANITIZE_ADDRESS__)
    __asan_handle_no_return();
#endif
  }
};

bool StartsWith(std::string const& text, char const* prefix) {
  return text.compare(0, std::strlen(prefix), prefix) == 0;
}

// Text of a string attribute, bounded by its payload.
std::string AttrText(rtattr const* rta) {
  char const* data = static_cast<char const*>(RTA_DATA(rta));
  const std::size_t size = RTA_PAYLOAD(rta);
  return std::string(data, strnlen(data, size));
}

std::string IndexToName(int index) {
  char name[IF_NAMESIZE + 1] = "";
  if (index <= 0 || if_indextoname(static_cast<unsigned int>(index), name) == nullptr) return "";
  return name;
}

// The ifcfg value of key for ifname, read into 1024 bytes; the length read (negative on failure).
int ReadIfcfg(std::string const& ifname, char const* key, std::string& value) {
  const std::string path = kIfcfgPrefix + ifname;
  char buf[1024] = "";
  const int len = VLIBCFileGetKeyValue(path.c_str(), key, buf, sizeof buf, 0);
  value = len > 0 ? buf : "";
  return len;
}

int SetOVSBondFlag(std::string const& path) {
  if (VLIBCFileTouch(path.c_str()) < 0) {
    VORN_LOG(LOG_ERR, "create file: %s failed", path.c_str());
    return -1;
  }
  return 0;
}

int ClearOVSBondFlag(std::string const& path) {
  if (unlink(path.c_str()) != 0 && errno != ENOENT) {
    VORN_LOG(LOG_ERR, "remove file: %s failed", path.c_str());
    return -1;
  }
  return 0;
}

}  // namespace

NetlinkModule::NetlinkModule()
    : BaseModule(MODULE_NETLINK),
      _netlinkFd(-1),
      _pollingThread(),
      _ipv4Map("none"),
      _ipv6Map(),
      _linkMap(false),
      _threadStarted(false) {}

NetlinkModule::~NetlinkModule() {
  // A module deleted without Terminate must not leave its thread running on a dead object.
  if (_threadStarted || _netlinkFd >= 0) NetlinkModule::TerminateModule();
}

BaseModule* NetlinkModule::Create() { return new NetlinkModule(); }

int NetlinkModule::InitialModule() {
  _netlinkFd = socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC, NETLINK_ROUTE);
  if (_netlinkFd < 0) {
    VORN_LOG(LOG_ERR, "NetlinkFd::Init socket(AF_NETLINK) fail.\n");
    return -1;
  }
  struct sockaddr_nl addr;
  std::memset(&addr, 0, sizeof addr);
  addr.nl_family = AF_NETLINK;
  addr.nl_pid = 0;
  addr.nl_groups = kNetlinkGroups;
  int on = 1;
  if (setsockopt(_netlinkFd, SOL_SOCKET, SO_REUSEADDR, &on, sizeof on) != 0) {
    const int err = errno;
    VORN_LOG(LOG_ERR, "Failed to setsockopt[SO_REUSEADDR] with err=[%d][%s]", err,
             std::strerror(err));
    return -1;
  }
  // A burst of changes (a script adding many addresses, a bond re-forming) must not overflow the
  // socket: the kernel's default buffer holds a few hundred messages, and an event lost to an
  // overflow is never reported. Memory is only taken while messages wait.
  int size = kSocketBufferBytes;
  if (setsockopt(_netlinkFd, SOL_SOCKET, SO_RCVBUFFORCE, &size, sizeof size) != 0 &&
      setsockopt(_netlinkFd, SOL_SOCKET, SO_RCVBUF, &size, sizeof size) != 0) {
    const int err = errno;
    VORN_LOG(LOG_WARNING, "Failed to enlarge the netlink receive buffer with err=[%d][%s]", err,
             std::strerror(err));
  }
  if (bind(_netlinkFd, reinterpret_cast<struct sockaddr*>(&addr), sizeof addr) != 0) {
    const int err = errno;
    VORN_LOG(LOG_ERR, "NetlinkFd::Init bind fail with err=[%d][%s]", err, std::strerror(err));
    return -1;
  }
  return 0;
}

int NetlinkModule::StartModule() {
  if (_threadStarted) return 0;
  if (pthread_create(&_pollingThread, nullptr, &NetlinkModule::PollingThread, this) != 0) {
    VORN_LOG(LOG_ERR, "Failed to create netlink polling thread");
    return 0;
  }
  _threadStarted = true;
  return 0;
}

int NetlinkModule::TerminateModule() {
  if (_threadStarted) {
    if (pthread_cancel(_pollingThread) != 0) {
      VORN_LOG(LOG_ERR, "Failed to cancel netlink thread");
    }
    void* result = nullptr;
    if (pthread_join(_pollingThread, &result) != 0) {
      VORN_LOG(LOG_ERR, "netlink thread is not cancelled");
    } else if (result != PTHREAD_CANCELED) {
      VORN_LOG(LOG_ERR, "netlink thread is not cancelled");
    }
    _threadStarted = false;
  }
  if (_netlinkFd >= 0) {
    close(_netlinkFd);
    _netlinkFd = -1;
  }
  return 0;
}

void* NetlinkModule::PollingThread(void* arg) {
  // Cancellation may only end the thread inside select (StartPolling opens that window).
  pthread_setcancelstate(PTHREAD_CANCEL_DISABLE, nullptr);
  long result = 0;
  // Cancellation unwinds through here and must go on: only std::exception is caught (the
  // unwinding is no such exception). StartPolling catches everything else itself, in the parts
  // where cancellation is disabled.
  try {
    result = static_cast<NetlinkModule*>(arg)->StartPolling();
  } catch (std::exception const& e) {
    VORN_LOG(LOG_ERR, "netlink polling thread ended by [%s]", e.what());
    result = -1;
  }
  pthread_exit(reinterpret_cast<void*>(result));
}

int NetlinkModule::StartPolling() {
  UnwindGuard guard;
  int oldState = 0;
  pthread_setcancelstate(PTHREAD_CANCEL_DISABLE, &oldState);
  if (_netlinkFd < 0 || _netlinkFd >= FD_SETSIZE) {
    VORN_LOG(LOG_ERR, "Bad RTNETLINK fd [%d]", _netlinkFd);
    pthread_setcancelstate(oldState, nullptr);
    return 0;
  }
  try {
    InitInterface();
  } catch (std::exception const& e) {
    VORN_LOG(LOG_ERR, "Failed to read the interfaces [%s]", e.what());
  } catch (...) {
    VORN_LOG(LOG_ERR, "Failed to read the interfaces");
  }
  for (;;) {
    fd_set readSet;
    FD_ZERO(&readSet);
    FD_SET(_netlinkFd, &readSet);
    struct timeval timeout;
    timeout.tv_sec = kPollSeconds;
    timeout.tv_usec = 0;
    int previous = 0;
    pthread_setcancelstate(PTHREAD_CANCEL_ENABLE, &previous);
    const int ready = select(_netlinkFd + 1, &readSet, nullptr, nullptr, &timeout);
    pthread_setcancelstate(PTHREAD_CANCEL_DISABLE, nullptr);
    if (ready < 1) continue;
    if (FD_ISSET(_netlinkFd, &readSet)) {
      try {
        AnalysisNetlinkMessage();
      } catch (std::exception const& e) {
        VORN_LOG(LOG_ERR, "Dropped a netlink message [%s]", e.what());
      } catch (...) {
        VORN_LOG(LOG_ERR, "Dropped a netlink message");
      }
    }
  }
}

int NetlinkModule::AnalysisNetlinkMessage() {
  char buffer[kRecvBufferSize];
  std::memset(buffer, 0, sizeof buffer);
  struct sockaddr_nl addr;
  std::memset(&addr, 0, sizeof addr);
  struct iovec iov;
  iov.iov_base = buffer;
  iov.iov_len = sizeof buffer;
  struct msghdr msg;
  std::memset(&msg, 0, sizeof msg);
  msg.msg_name = &addr;
  msg.msg_namelen = sizeof addr;
  msg.msg_iov = &iov;
  msg.msg_iovlen = 1;
  const ssize_t received = recvmsg(_netlinkFd, &msg, 0);
  if (received < 1) {
    VORN_LOG(LOG_ERR, "recvmsg ret: [%zd] from fd [%d].", received, _netlinkFd);
    return -1;
  }
  // A truncated datagram holds as many whole messages as fit in the buffer.
  ssize_t remaining = received > static_cast<ssize_t>(sizeof buffer)
                          ? static_cast<ssize_t>(sizeof buffer)
                          : received;
  char* cursor = buffer;
  while (remaining >= static_cast<ssize_t>(sizeof(nlmsghdr))) {
    nlmsghdr* header = reinterpret_cast<nlmsghdr*>(cursor);
    if (header->nlmsg_len < sizeof(nlmsghdr) ||
        static_cast<ssize_t>(header->nlmsg_len) > remaining) {
      break;
    }
    switch (header->nlmsg_type) {
      case RTM_NEWADDR:
      case RTM_DELADDR:
        CheckIPChangeEvent(header);
        break;
      case RTM_NEWLINK:
        CheckNewLinkEvent(header);
        break;
      case RTM_NEWROUTE:
      case RTM_DELROUTE:
        CheckRouteChangeEvent(header);
        break;
      default:
        break;  // RTM_DELLINK and the rest are not looked at
    }
    const ssize_t step = static_cast<ssize_t>(NLMSG_ALIGN(header->nlmsg_len));
    if (step >= remaining) break;
    cursor += step;
    remaining -= step;
  }
  return 0;
}

int NetlinkModule::CheckNewLinkEvent(nlmsghdr* header) {
  if (header == nullptr) {
    VORN_LOG(LOG_ERR, "Null pointer");
    return -1;
  }
  if (header->nlmsg_type != RTM_NEWLINK) {
    VORN_LOG(LOG_ERR, "Not RTM_NEWLINK event");
    return -1;
  }
  if (header->nlmsg_len < NLMSG_LENGTH(sizeof(ifinfomsg))) {
    VORN_LOG(LOG_ERR, "Bad netlink message length [%u]", header->nlmsg_len);
    return -1;
  }
  ifinfomsg* info = static_cast<ifinfomsg*>(NLMSG_DATA(header));
  // Running without lower-up is a passing state: the next message tells the real one.
  if ((info->ifi_flags & kRunningWithoutLowerUpMask) == IFF_RUNNING) return -1;

  int remaining = static_cast<int>(header->nlmsg_len - NLMSG_LENGTH(sizeof(ifinfomsg)));
  rtattr* attr = IFLA_RTA(info);
  while (remaining >= static_cast<int>(sizeof(rtattr))) {
    if (attr->rta_len < sizeof(rtattr) || static_cast<int>(attr->rta_len) > remaining) break;
    if (attr->rta_type == IFLA_IFNAME) {
      const int result = HandleLinkEvent(AttrText(attr), static_cast<short>(info->ifi_flags));
      if (result != -1) return result;
    }
    const int step = static_cast<int>(RTA_ALIGN(attr->rta_len));
    remaining -= step;
    attr = reinterpret_cast<rtattr*>(reinterpret_cast<char*>(attr) + step);
  }
  return -1;
}

int NetlinkModule::HandleLinkEvent(std::string const& ifname, short flags) {
  bool up = (flags & IFF_RUNNING) != 0;
  // The OVS bond itself is reported through its members.
  if (StartsWith(ifname, "ovs_bond")) return -1;

  bool slave = (flags & IFF_SLAVE) != 0 || VORNNetIfIsBondingPassive(ifname.c_str()) != 0;
  if (!slave) {
    std::string value;
    if (ReadIfcfg(ifname, "SLAVE", value) >= 1 && StartsWith(value, "yes")) slave = true;
  }
  if (slave && VLIBNetOVSIfIsSlave(ifname.c_str()) != 0) {
    std::string master;
    bool masterUp = false;
    if (GetOVSMasterStatus(ifname, up, master, masterUp) < 0) return 0;
    return OnInterfaceStatusChange(master, masterUp, false) ? 1 : 0;
  }
  // The kernel's flag of an OVS master says nothing about its members.
  if (VLIBNetOVSIfIsMaster(ifname.c_str()) == 1) up = VORNNetIfIsLink(ifname.c_str()) == 1;
  return OnInterfaceStatusChange(ifname, up, slave) ? 1 : 0;
}

int NetlinkModule::GetOVSMasterStatus(std::string const& slave, bool slaveUp, std::string& master,
                                      bool& masterUp) {
  if (ReadIfcfg(slave, "MASTER", master) < 0) {
    VORN_LOG(LOG_ERR, "Fail to get the %s from %s", "MASTER", (kIfcfgPrefix + slave).c_str());
    return -1;
  }
  std::string slaveList;
  if (ReadIfcfg(master, "SLAVE_LIST", slaveList) < 0) {
    VORN_LOG(LOG_ERR, "Fail to get the %s from %s", "SLAVE_LIST",
             (kIfcfgPrefix + master).c_str());
    return -1;
  }
  PVLIBSZLIST list = VLIBCSzListAlloc(512);
  if (list == nullptr) {
    VORN_LOG(LOG_ERR, "Failed to alloc memory.");
    return -1;
  }
  std::vector<char> text(slaveList.begin(), slaveList.end());
  text.push_back('\0');
  VLIBCStrTrimSpace(text.data());
  int linked = 0;
  if (VLIBCStrSep(text.data(), " \t", &list) > 0) {
    for (int i = 0; i < VLIBCSzListCount(list); ++i) {
      char const* member = VLIBCSzListGet(list, i);
      if (member != nullptr && member[0] != '\0' && VORNNetIfIsLink(member) == 1) ++linked;
    }
  }
  VLIBCSzListFree(list);

  char flagFile[1024];
  std::snprintf(flagFile, sizeof flagFile, kOVSBondFlagFormat, master.c_str());
  if (linked > 0 && slaveUp) {
    if (VLIBCFileExist(flagFile) == 1) return -1;  // already reported up
    masterUp = true;
    if (SetOVSBondFlag(flagFile) != 0) {
      VORN_LOG(LOG_ERR, "set ovs bond hook flag failed");
      return -1;
    }
    return 0;
  }
  if (linked == 0) {
    masterUp = false;
    if (VLIBCFileExist(flagFile) == 1) {
      if (ClearOVSBondFlag(flagFile) != 0) {
        VORN_LOG(LOG_ERR, "clear ovs bond hook flag failed");
        return -1;
      }
    } else {
      VORN_LOG(LOG_INFO, "ovs_bond hook flag is not exist");
    }
    return 0;
  }
  return -1;  // a member went down and others carry the bond
}

bool NetlinkModule::OnInterfaceStatusChange(std::string const& ifname, bool linkUp,
                                            bool isSlave) {
  const bool unchanged = _linkMap.Has(ifname) && _linkMap.Get(ifname) == linkUp;
  if (!isSlave && !unchanged) {
    if (!StartsWith(ifname, "tap")) {
      vornwireless::utils::SetNetLinkIsProcessing();
      if (ifname.find("docker") == std::string::npos) {
        if (linkUp) {
          vornnetsdk::sdk_s::VLIBNetIfLinkUpEvent_S(ifname.c_str());
        } else {
          vornnetsdk::sdk_s::VLIBNetIfLinkDownEvent_S(ifname.c_str());
        }
      }
      vornwireless::utils::UnsetNetLinkIsProcessing();
    }
  } else {
    VORN_LOG(LOG_DEBUG, "Drop event by slave=[%d], linkStatus=[%d]", isSlave ? 1 : 0,
             unchanged ? 1 : 0);
  }
  _linkMap.Set(ifname, linkUp);
  return !linkUp;
}

int NetlinkModule::CheckIPChangeEvent(nlmsghdr* header) {
  if (header == nullptr) {
    VORN_LOG(LOG_ERR, "Null pointer");
    return -1;
  }
  if (header->nlmsg_len < NLMSG_LENGTH(sizeof(ifaddrmsg))) {
    VORN_LOG(LOG_ERR, "Bad netlink message length [%u]", header->nlmsg_len);
    return -1;
  }
  ifaddrmsg* addrMsg = static_cast<ifaddrmsg*>(NLMSG_DATA(header));
  rtattr* table[7];
  vornwireless::utils::parse_rtattr(table, 6, IFA_RTA(addrMsg),
                                    static_cast<int>(IFA_PAYLOAD(header)));
  rtattr* address = table[IFA_LOCAL] != nullptr ? table[IFA_LOCAL] : table[IFA_ADDRESS];
  if (address == nullptr) return -1;

  char text[1024] = "";
  const std::size_t need = addrMsg->ifa_family == AF_INET6 ? 16 : 4;
  if (RTA_PAYLOAD(address) >= need) {
    inet_ntop(addrMsg->ifa_family, RTA_DATA(address), text, sizeof text);
  }
  const std::string ip = text;

  std::string ifname;
  if (table[IFA_LABEL] != nullptr) {
    ifname = AttrText(table[IFA_LABEL]);
  } else {
    ifname = IndexToName(static_cast<int>(addrMsg->ifa_index));
    if (ifname.empty()) {
      VORN_LOG(LOG_DEBUG, "No interface of index [%u]", addrMsg->ifa_index);
      return -1;
    }
  }
  if (ifname.find("docker") != std::string::npos || StartsWith(ifname, "tap")) return 0;

  const bool isNew = header->nlmsg_type == RTM_NEWADDR;
  if (ip.empty()) return -1;
  if (addrMsg->ifa_family == AF_INET) {
    return ProcessIPv4Event(ifname, ip, addrMsg->ifa_prefixlen, isNew);
  }
  if (addrMsg->ifa_family == AF_INET6) {
    return ProcessIPv6Event(ifname, ip, addrMsg->ifa_prefixlen, isNew);
  }
  return -1;
}

int NetlinkModule::ProcessIPv4Event(std::string const& ifname, std::string const& ip,
                                    int prefixLength, bool /*isNew*/) {
  // A delete is handled like a new address: the stored one stays until another comes.
  if (_ipv4Map.Has(ifname) && _ipv4Map.Get(ifname) == ip) return 0;
  const std::string old = _ipv4Map.Get(ifname);
  vornwireless::hook::NetIPChangeEvent(vornwireless::hook::IPTYPE_IPV4, ifname, old, ip,
                                       prefixLength);
  _ipv4Map.Set(ifname, ip);
  return 0;
}

int NetlinkModule::ProcessIPv6Event(std::string const& ifname, std::string const& ip,
                                    int prefixLength, bool isNew) {
  std::map<std::string, std::vector<std::string> >::const_iterator found = _ipv6Map.find(ifname);
  std::vector<std::string> list;
  if (found != _ipv6Map.end()) list = found->second;
  if (isNew) {
    if (vornwireless::utils::Find(ip, list) >= 0) return 0;
    const std::string joined = vornwireless::utils::ConvertToString(list, ",");
    vornwireless::hook::NetIPChangeEvent(vornwireless::hook::IPTYPE_IPV6, ifname, joined, ip,
                                         prefixLength);
    list.push_back(ip);
    _ipv6Map[ifname] = list;
    return 0;
  }
  const int index = vornwireless::utils::Find(ip, list);
  if (index < 0) return 0;
  list.erase(list.begin() + index);
  _ipv6Map[ifname] = list;
  return 0;
}

int NetlinkModule::CheckRouteChangeEvent(nlmsghdr* header) {
  if (header == nullptr) {
    VORN_LOG(LOG_ERR, "Null pointer");
    return -1;
  }
  if (header->nlmsg_len < NLMSG_LENGTH(sizeof(rtmsg))) {
    VORN_LOG(LOG_ERR, "Bad netlink message length [%u]", header->nlmsg_len);
    return -1;
  }
  rtmsg* route = static_cast<rtmsg*>(NLMSG_DATA(header));
  if (route->rtm_table != RT_TABLE_MAIN) return -1;

  std::string ifname;
  std::string destination;
  std::string gateway;
  int remaining = static_cast<int>(RTM_PAYLOAD(header));
  rtattr* attr = RTM_RTA(route);
  while (remaining >= static_cast<int>(sizeof(rtattr))) {
    if (attr->rta_len < sizeof(rtattr) || static_cast<int>(attr->rta_len) > remaining) break;
    const std::size_t payload = RTA_PAYLOAD(attr);
    if (attr->rta_type == RTA_OIF && payload >= sizeof(int)) {
      int index = 0;
      std::memcpy(&index, RTA_DATA(attr), sizeof index);
      ifname = IndexToName(index);
    } else if ((attr->rta_type == RTA_DST || attr->rta_type == RTA_GATEWAY) && payload >= 4) {
      char text[32] = "";
      if (inet_ntop(AF_INET, RTA_DATA(attr), text, sizeof text) != nullptr) {
        (attr->rta_type == RTA_DST ? destination : gateway) = text;
      }
    }
    const int step = static_cast<int>(RTA_ALIGN(attr->rta_len));
    remaining -= step;
    attr = reinterpret_cast<rtattr*>(reinterpret_cast<char*>(attr) + step);
  }

  const std::string action = header->nlmsg_type == RTM_NEWROUTE ? "NEW" : "DEL";
  std::unique_ptr<vornwireless::hook::GatewayChangeHook> hook(
      new vornwireless::hook::GatewayChangeHook(action, ifname, destination, gateway));
  hook->ExecHook(kGatewayHookAction);
  return 0;
}

int NetlinkModule::InitInterface() {
  VLIB_NET_IF_INFO interfaces[kInterfaceCapacity];
  std::memset(interfaces, 0, sizeof interfaces);
  const int count = VLIBNetGetInterfaceInfo(interfaces, kInterfaceCapacity, kInterfaceKind);
  if (count < 0) {
    VORN_LOG(LOG_ERR, "Failed to get net interface, errno=0x%X", VLIBCErrGet());
    return -1;
  }
  for (int i = 0; i < count; ++i) {
    const std::string name = interfaces[i].szIfName;
    if (interfaces[i].iStatus == VLIB_NET_IF_STATUS_UP) {
      _linkMap.Set(name, true);
      _ipv4Map.Set(name, interfaces[i].szIP);
    } else {
      _linkMap.Set(name, false);
    }
  }
  return 0;
}

int NetlinkModule::RequestDHCPIP(std::string const& ifname) const {
  if (StartsWith(ifname, "wlan")) return 0;
  if (VLIBNetBridgeIfIsSlave(ifname.c_str()) == 1 || BlVORNLnxIsDHCP_S(ifname.c_str()) == 0) {
    return -1;
  }
  VORN_NETIF_INFO info;
  std::memset(&info, 0, sizeof info);
  if (VORNNetIFGetInfo_S(ifname.c_str(), &info) < 0) {
    VORN_LOG(LOG_ERR, "Get %s net info failed", ifname.c_str());
    return -1;
  }
  if (VORNNetSetCard1_S(&info) < 0) {
    VORN_LOG(LOG_ERR, "VORNNetSetCard1_S failed, vornerr=[0x%04X]", VLIBCErrGet());
    return -1;
  }
  return 0;
}

}  // namespace module
}  // namespace network
}  // namespace vornnetwork
