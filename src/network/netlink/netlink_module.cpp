// The kernel link watcher: link, address and main-table route messages become link events and
// hooks. The polling thread is the only one that touches the socket and the maps.
#include "vornwireless/network/netlink/netlink_module.h"

#include <arpa/inet.h>
#include <dirent.h>
#include <linux/rtnetlink.h>
#include <net/if.h>
#include <poll.h>
#include <signal.h>
#include <sys/eventfd.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <time.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <fstream>
#include <memory>
#include <set>

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
// A datagram cut short grows the receive buffer up to this size.
const std::size_t kMaxRecvBufferBytes = 1024 * 1024;
// Receive buffer of the socket (the kernel doubles it for its own bookkeeping).
const int kSocketBufferBytes = 4 * 1024 * 1024;
// Environment variable that sets the socket's receive buffer instead (bytes).
const char kRecvBufferKnob[] = "VORN_NETLINK_RCVBUF";
// Reads (of up to kDatagramsPerRead datagrams each) in one go before the thread looks at its
// stop flag and the socket again.
const int kDatagramsPerWake = 256;
// Queued datagrams dropped at most before the state is read again (a flood that never pauses
// must not keep the thread from reading it).
const long kMaxDroppedDatagrams = 1000000;
// A dump that does not answer within this time fails (the state stays to be read).
const int kDumpTimeoutSeconds = 5;
// A dump interrupted by changes is read again this many times at most.
const int kDumpAttempts = 5;
// How long TerminateModule waits for the thread at most once the children it waits for are
// being killed; it then logs and waits for it without end.
const int kStopKillPhaseMs = 10000;
// The flags of a link that matter to the link events.
const unsigned int kLinkFlagsMask = IFF_UP | IFF_RUNNING | IFF_SLAVE | 0x10000;
const int kInterfaceCapacity = 32;
const int kInterfaceKind = 3;
const int kGatewayHookAction = 5;
const unsigned int kRunningWithoutLowerUpMask = 0x10040;  // IFF_LOWER_UP | IFF_RUNNING

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

int64_t MonotonicMs() {
  struct timespec ts;
  clock_gettime(CLOCK_MONOTONIC, &ts);
  return static_cast<int64_t>(ts.tv_sec) * 1000 + ts.tv_nsec / 1000000;
}

// The interface flags and name of a link message held as bytes (checked when it was stored).
unsigned int StoredLinkFlags(std::string const& bytes) {
  ifinfomsg info;
  std::memcpy(&info, bytes.data() + NLMSG_HDRLEN, sizeof info);
  return info.ifi_flags;
}

std::string StoredLinkName(std::string const& bytes) {
  int remaining = static_cast<int>(bytes.size()) - static_cast<int>(NLMSG_LENGTH(sizeof(ifinfomsg)));
  std::size_t offset = NLMSG_LENGTH(sizeof(ifinfomsg));
  while (remaining >= static_cast<int>(sizeof(rtattr))) {
    rtattr attr;
    std::memcpy(&attr, bytes.data() + offset, sizeof attr);
    if (attr.rta_len < sizeof(rtattr) || static_cast<int>(attr.rta_len) > remaining) break;
    if (attr.rta_type == IFLA_IFNAME) {
      char const* data = bytes.data() + offset + RTA_LENGTH(0);
      return std::string(data, strnlen(data, attr.rta_len - RTA_LENGTH(0)));
    }
    const int step = static_cast<int>(RTA_ALIGN(attr.rta_len));
    remaining -= step;
    offset += static_cast<std::size_t>(step);
  }
  return "";
}

// The gateway and output interface of a stored route message, as bytes.
std::string RouteWay(std::string const& bytes) {
  std::string way;
  int remaining = static_cast<int>(bytes.size()) - static_cast<int>(NLMSG_LENGTH(sizeof(rtmsg)));
  std::size_t offset = NLMSG_LENGTH(sizeof(rtmsg));
  while (remaining >= static_cast<int>(sizeof(rtattr))) {
    rtattr attr;
    std::memcpy(&attr, bytes.data() + offset, sizeof attr);
    if (attr.rta_len < sizeof(rtattr) || static_cast<int>(attr.rta_len) > remaining) break;
    if (attr.rta_type == RTA_GATEWAY || attr.rta_type == RTA_OIF || attr.rta_type == RTA_MULTIPATH) {
      way.push_back(static_cast<char>(attr.rta_type));
      way.append(bytes.data() + offset + RTA_LENGTH(0), attr.rta_len - RTA_LENGTH(0));
    }
    const int step = static_cast<int>(RTA_ALIGN(attr.rta_len));
    remaining -= step;
    offset += static_cast<std::size_t>(step);
  }
  return way;
}

// An aligned, writable copy of a stored message, to hand to a Check* operation.
class MessageCopy {
 public:
  explicit MessageCopy(std::string const& bytes) : _words((bytes.size() + 7) / 8 + 1, 0) {
    std::memcpy(_words.data(), bytes.data(), bytes.size());
  }
  nlmsghdr* Header() { return reinterpret_cast<nlmsghdr*>(_words.data()); }
  template <typename T>
  T* Body() { return static_cast<T*>(NLMSG_DATA(Header())); }

 private:
  std::vector<uint64_t> _words;
};

// Sends one dump request and collects its answers: links by index, addresses by key (with their
// order), main-table IPv4 routes by key. 0; 1 when the dump was interrupted by changes or cut
// (read again); -1 on failure.
int ReadDump(int fd, uint16_t type, uint32_t seq, std::vector<char>& buffer,
             NetlinkModule::KernelState& state, std::vector<std::string>* order) {
  struct {
    nlmsghdr header;
    ifinfomsg body;  // an ifaddrmsg request uses its first 8 bytes
  } request;
  std::memset(&request, 0, sizeof request);
  request.header.nlmsg_len = type == RTM_GETLINK   ? NLMSG_LENGTH(sizeof(ifinfomsg))
                             : type == RTM_GETADDR ? NLMSG_LENGTH(sizeof(ifaddrmsg))
                                                   : NLMSG_LENGTH(sizeof(rtmsg));
  request.header.nlmsg_type = type;
  request.header.nlmsg_flags = NLM_F_REQUEST | NLM_F_DUMP;
  request.header.nlmsg_seq = seq;
  // The family is the first byte of each body; routes are watched for IPv4 only.
  request.body.ifi_family = type == RTM_GETROUTE ? AF_INET : AF_UNSPEC;
  struct sockaddr_nl kernel;
  std::memset(&kernel, 0, sizeof kernel);
  kernel.nl_family = AF_NETLINK;
  if (sendto(fd, &request, request.header.nlmsg_len, 0, reinterpret_cast<sockaddr*>(&kernel),
             sizeof kernel) < 0) {
    const int err = errno;
    VORN_LOG(LOG_ERR, "Failed to ask the kernel for its state with err=[%d][%s]", err,
             std::strerror(err));
    return -1;
  }
  const uint16_t answer = type == RTM_GETLINK   ? RTM_NEWLINK
                          : type == RTM_GETADDR ? RTM_NEWADDR
                                                : RTM_NEWROUTE;
  bool interrupted = false;
  for (;;) {
    struct sockaddr_nl from;
    std::memset(&from, 0, sizeof from);
    struct iovec iov = {buffer.data(), buffer.size()};
    struct msghdr msg;
    std::memset(&msg, 0, sizeof msg);
    msg.msg_name = &from;
    msg.msg_namelen = sizeof from;
    msg.msg_iov = &iov;
    msg.msg_iovlen = 1;
    const ssize_t n = recvmsg(fd, &msg, MSG_TRUNC);
    if (n < 0 && errno == EINTR) continue;
    if (n < 0) {
      const int err = errno;
      VORN_LOG(LOG_ERR, "Failed to read the kernel's state with err=[%d][%s]", err,
               std::strerror(err));
      return -1;
    }
    if ((msg.msg_flags & MSG_TRUNC) != 0 || static_cast<std::size_t>(n) > buffer.size()) {
      if (static_cast<std::size_t>(n) <= kMaxRecvBufferBytes) buffer.resize(NLMSG_ALIGN(n) + 4096);
      return 1;  // read again with the larger buffer
    }
    if (from.nl_pid != 0) continue;
    int remaining = static_cast<int>(n);
    // NLMSG_OK spelled out: the macro compares the unsigned length with the signed rest.
    for (nlmsghdr* h = reinterpret_cast<nlmsghdr*>(buffer.data());
         remaining >= static_cast<int>(sizeof(nlmsghdr)) && h->nlmsg_len >= sizeof(nlmsghdr) &&
         h->nlmsg_len <= static_cast<unsigned>(remaining);
         h = NLMSG_NEXT(h, remaining)) {
      if (h->nlmsg_seq != seq) continue;
      if ((h->nlmsg_flags & NLM_F_DUMP_INTR) != 0) interrupted = true;
      if (h->nlmsg_type == NLMSG_DONE) return interrupted ? 1 : 0;
      if (h->nlmsg_type == NLMSG_ERROR) {
        VORN_LOG(LOG_ERR, "The kernel refused to give its state (type [%u])", type);
        return -1;
      }
      if (h->nlmsg_type != answer) continue;
      const std::string bytes(reinterpret_cast<char const*>(h), h->nlmsg_len);
      if (answer == RTM_NEWLINK) {
        if (h->nlmsg_len < NLMSG_LENGTH(sizeof(ifinfomsg))) continue;
        state.links[static_cast<ifinfomsg*>(NLMSG_DATA(h))->ifi_index] = bytes;
      } else if (answer == RTM_NEWROUTE) {
        const std::string key = NetlinkModule::RouteKey(h);
        if (!key.empty()) state.routes[key] = bytes;
      } else {
        const std::string key = NetlinkModule::AddressKey(h);
        if (key.empty()) continue;
        if (state.addresses.emplace(key, bytes).second) order->push_back(key);
      }
    }
  }
}

}  // namespace

NetlinkModule::NetlinkModule()
    : BaseModule(MODULE_NETLINK),
      _netlinkFd(-1),
      _pollingThread(),
      _ipv4Map("none"),
      _ipv6Map(),
      _linkMap(false),
      _threadStarted(false),
      _wakeFd(-1),
      _stopRequested(false),
      _threadEnded(false),
      _pollingTid(0),
      _recvArea(),
      _slotBytes(0),
      _lastDatagrams(0),
      _resyncPending(false),
      _lostCount(0),
      _known() {}

NetlinkModule::~NetlinkModule() {
  // A module deleted without Terminate must not leave its thread running on a dead object.
  if (_threadStarted || _netlinkFd >= 0 || _wakeFd >= 0) NetlinkModule::TerminateModule();
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
  // The knob sets it exactly (a small buffer for a box short of memory, or to try the re-reading
  // of the state after an overflow).
  int size = kSocketBufferBytes;
  char const* knob = std::getenv(kRecvBufferKnob);
  if (knob != nullptr && knob[0] != '\0') {
    char* end = nullptr;
    const long value = std::strtol(knob, &end, 10);
    if (*end == '\0' && value > 0 && value <= (1L << 30)) {
      size = static_cast<int>(value);
      VORN_LOG(LOG_INFO, "Netlink receive buffer set to [%d] bytes by %s", size, kRecvBufferKnob);
    } else {
      VORN_LOG(LOG_WARNING, "Ignored %s=[%s]: not a size in bytes", kRecvBufferKnob, knob);
    }
  }
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
  if (_wakeFd < 0) _wakeFd = eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
  if (_wakeFd < 0) {
    const int err = errno;
    VORN_LOG(LOG_WARNING, "No wake-up for the netlink thread with err=[%d][%s]", err,
             std::strerror(err));
  }
  return 0;
}

int NetlinkModule::StartModule() {
  if (_threadStarted) return 0;
  _stopRequested = false;
  _threadEnded = false;
  if (pthread_create(&_pollingThread, nullptr, &NetlinkModule::PollingThread, this) != 0) {
    VORN_LOG(LOG_ERR, "Failed to create netlink polling thread");
    return 0;
  }
  _threadStarted = true;
  return 0;
}

int NetlinkModule::TerminateModule() {
  if (_threadStarted) {
    // The thread looks at the flag between messages and wakes from poll by the eventfd. A hook
    // or action it runs meanwhile gets a grace to finish; then its process group is killed,
    // again and again, since the thread may start the next program before it sees the flag.
    _stopRequested = true;
    if (_wakeFd >= 0) {
      const uint64_t one = 1;
      if (write(_wakeFd, &one, sizeof one) < 0) {
        // A full counter wakes the thread as well.
      }
    }
    const int64_t killFrom = MonotonicMs() + kStopGraceMs;
    const int64_t giveUp = killFrom + kStopKillPhaseMs;
    bool killed = false;
    while (!_threadEnded) {
      const int64_t now = MonotonicMs();
      if (now >= giveUp) {
        VORN_LOG(LOG_ERR, "netlink thread did not stop within [%d] ms",
                 kStopGraceMs + kStopKillPhaseMs);
        break;
      }
      if (now >= killFrom) {
        if (!killed) {
          VORN_LOG(LOG_WARNING, "netlink thread still runs a program at stop: killing it");
          killed = true;
        }
        KillPollingThreadChildren();
      }
      poll(nullptr, 0, 10);
    }
    void* result = nullptr;
    if (pthread_join(_pollingThread, &result) != 0) {
      VORN_LOG(LOG_ERR, "netlink thread is not cancelled");
    } else if (result != PTHREAD_CANCELED) {
      VORN_LOG(LOG_ERR, "netlink thread is not cancelled");
    }
    _threadStarted = false;
    _pollingTid = 0;
    if (_threadEnded) LogView();  // the thread no longer touches the maps
  }
  if (_netlinkFd >= 0) {
    close(_netlinkFd);
    _netlinkFd = -1;
  }
  if (_wakeFd >= 0) {
    close(_wakeFd);
    _wakeFd = -1;
  }
  return 0;
}

namespace {

// The children of every thread of process pid.
std::vector<pid_t> ChildrenOf(pid_t pid, pid_t onlyTask) {
  std::vector<pid_t> out;
  std::vector<std::string> tasks;
  if (onlyTask > 0) {
    tasks.push_back(std::to_string(onlyTask));
  } else {
    const std::string dir = "/proc/" + std::to_string(pid) + "/task";
    DIR* d = opendir(dir.c_str());
    if (d == nullptr) return out;
    while (struct dirent* e = readdir(d)) {
      if (e->d_name[0] != '.') tasks.push_back(e->d_name);
    }
    closedir(d);
  }
  for (auto const& task : tasks) {
    std::ifstream in(("/proc/" + std::to_string(pid) + "/task/" + task + "/children").c_str());
    pid_t child = 0;
    while (in >> child) {
      if (child > 0) out.push_back(child);
    }
  }
  return out;
}

}  // namespace

void NetlinkModule::KillPollingThreadChildren() const {
  const pid_t tid = _pollingTid;
  if (tid <= 0) return;
  // The programs the thread waits for and everything they started (a program runs in a group of
  // its own, which goes as a whole too).
  std::vector<pid_t> tree = ChildrenOf(getpid(), tid);
  for (std::size_t i = 0; i < tree.size() && tree.size() < 4096; ++i) {
    for (pid_t grandchild : ChildrenOf(tree[i], 0)) tree.push_back(grandchild);
  }
  for (pid_t pid : tree) {
    if (getpgid(pid) == pid) kill(-pid, SIGKILL);
    kill(pid, SIGKILL);
  }
}

void* NetlinkModule::PollingThread(void* arg) {
  NetlinkModule* self = static_cast<NetlinkModule*>(arg);
  self->_pollingTid = static_cast<pid_t>(syscall(SYS_gettid));
  long result = 0;
  try {
    result = self->StartPolling();
  } catch (std::exception const& e) {
    VORN_LOG(LOG_ERR, "netlink polling thread ended by [%s]", e.what());
    result = -1;
  } catch (...) {
    VORN_LOG(LOG_ERR, "netlink polling thread ended by an exception");
    result = -1;
  }
  // A thread stopped on request ends as a cancelled one would; one that ended by itself does not.
  void* value = self->_stopRequested ? PTHREAD_CANCELED : reinterpret_cast<void*>(result);
  self->_threadEnded = true;
  return value;
}

int NetlinkModule::StartPolling() {
  if (_netlinkFd < 0) {
    VORN_LOG(LOG_ERR, "Bad RTNETLINK fd [%d]", _netlinkFd);
    return 0;
  }
  try {
    InitInterface();
  } catch (std::exception const& e) {
    VORN_LOG(LOG_ERR, "Failed to read the interfaces [%s]", e.what());
  } catch (...) {
    VORN_LOG(LOG_ERR, "Failed to read the interfaces");
  }
  // What the kernel holds now, so that a later loss of events is measured against it.
  try {
    KernelState now;
    if (ReadKernelState(now) == 0) {
      _known = std::move(now);
      RebuildIndexNames();
      _resyncPending = false;
    }
  } catch (...) {
    VORN_LOG(LOG_ERR, "Failed to read the kernel's links and addresses");
  }
  while (!_stopRequested) {
    struct pollfd fds[2];
    fds[0].fd = _netlinkFd;
    fds[0].events = POLLIN;
    fds[0].revents = 0;
    fds[1].fd = _wakeFd;
    fds[1].events = POLLIN;
    fds[1].revents = 0;
    const int ready = poll(fds, _wakeFd >= 0 ? 2 : 1, kPollSeconds * 1000);
    if (_stopRequested) break;
    if (ready > 0 && fds[0].revents != 0) {
      // Everything queued, a bounded number at a time.
      for (int i = 0; i < kDatagramsPerWake && !_stopRequested; ++i) {
        int result = -1;
        try {
          result = AnalysisNetlinkMessage();
        } catch (std::exception const& e) {
          VORN_LOG(LOG_ERR, "Dropped a netlink message [%s]", e.what());
          result = 0;
        } catch (...) {
          VORN_LOG(LOG_ERR, "Dropped a netlink message");
          result = 0;
        }
        if (_resyncPending) break;
        // Fewer than asked for: the queue is empty (poll tells when more comes).
        if (result != 0 || _lastDatagrams < kDatagramsPerRead) break;
      }
    }
    if (_resyncPending && !_stopRequested) {
      try {
        ResyncKernelState();
      } catch (...) {
        VORN_LOG(LOG_ERR, "Failed to read the kernel's links and addresses");
      }
    }
  }
  return 0;
}

void NetlinkModule::EnsureRecvArea(std::size_t slotBytes) {
  if (_recvArea && _slotBytes >= slotBytes) return;
  // Not zeroed: only the pages a datagram is written to become resident.
  _recvArea.reset(new char[slotBytes * kDatagramsPerRead]);
  _slotBytes = slotBytes;
}

int NetlinkModule::AnalysisNetlinkMessage() {
  _lastDatagrams = 0;
  EnsureRecvArea(kRecvBufferBytes);
  struct sockaddr_nl addrs[kDatagramsPerRead];
  struct iovec iovs[kDatagramsPerRead];
  struct mmsghdr msgs[kDatagramsPerRead];
  std::memset(addrs, 0, sizeof addrs);
  std::memset(msgs, 0, sizeof msgs);
  for (int i = 0; i < kDatagramsPerRead; ++i) {
    iovs[i].iov_base = _recvArea.get() + static_cast<std::size_t>(i) * _slotBytes;
    iovs[i].iov_len = _slotBytes;
    msgs[i].msg_hdr.msg_name = &addrs[i];
    msgs[i].msg_hdr.msg_namelen = sizeof addrs[i];
    msgs[i].msg_hdr.msg_iov = &iovs[i];
    msgs[i].msg_hdr.msg_iovlen = 1;
  }
  // Whatever is queued, a few datagrams in one call. MSG_TRUNC: each length is the datagram's
  // whole length even when its buffer held less.
  const int count = recvmmsg(_netlinkFd, msgs, kDatagramsPerRead, MSG_DONTWAIT | MSG_TRUNC,
                             nullptr);
  if (count < 0 && (errno == EAGAIN || errno == EWOULDBLOCK || errno == EINTR)) return 1;
  if (count < 1) {
    const int err = errno;
    VORN_LOG(LOG_ERR, "recvmsg ret: [%zd] from fd [%d].", static_cast<ssize_t>(count < 0 ? -1 : 0),
             _netlinkFd);
    if (count < 0 && err == ENOBUFS) {
      // The socket overflowed: the kernel dropped messages and keeps dropping until the queue
      // is empty.
      ++_lostCount;
      _resyncPending = true;
      VORN_LOG(LOG_WARNING,
               "Netlink events lost (ENOBUFS), reading the link and address state again");
    }
    return -1;
  }
  _lastDatagrams = count;
  for (int i = 0; i < count && !_stopRequested; ++i) {
    const std::size_t received = msgs[i].msg_len;
    if (received == 0) {
      VORN_LOG(LOG_ERR, "recvmsg ret: [%zd] from fd [%d].", static_cast<ssize_t>(0), _netlinkFd);
      continue;
    }
    if ((msgs[i].msg_hdr.msg_flags & MSG_TRUNC) != 0 || received > _slotBytes) {
      ++_lostCount;
      _resyncPending = true;
      VORN_LOG(LOG_WARNING,
               "Netlink datagram of [%zu] bytes cut to [%zu] (MSG_TRUNC), reading the link and "
               "address state again",
               received, _slotBytes);
      if (received <= kMaxRecvBufferBytes) {
        EnsureRecvArea(NLMSG_ALIGN(received));
      }
      // What came with it is older than the state read next: not looked at either.
      return 0;
    }
    HandleDatagram(static_cast<char*>(iovs[i].iov_base), static_cast<ssize_t>(received),
                   addrs[i].nl_pid == 0);
  }
  return 0;
}

void NetlinkModule::HandleDatagram(char* data, ssize_t received, bool fromKernel) {
  ssize_t remaining = received;
  char* cursor = data;
  while (remaining >= static_cast<ssize_t>(sizeof(nlmsghdr)) && !_stopRequested) {
    nlmsghdr* header = reinterpret_cast<nlmsghdr*>(cursor);
    if (header->nlmsg_len < sizeof(nlmsghdr) ||
        static_cast<ssize_t>(header->nlmsg_len) > remaining) {
      break;
    }
    switch (header->nlmsg_type) {
      case RTM_NEWADDR:
      case RTM_DELADDR:
        if (fromKernel) NoteKernelMessage(header);
        CheckIPChangeEvent(header);
        break;
      case RTM_NEWLINK:
        if (fromKernel) NoteKernelMessage(header);
        CheckNewLinkEvent(header);
        break;
      case RTM_DELLINK:
        if (fromKernel) NoteKernelMessage(header);
        break;  // not looked at otherwise
      case RTM_NEWROUTE:
      case RTM_DELROUTE:
        if (fromKernel) NoteKernelMessage(header);
        CheckRouteChangeEvent(header);
        break;
      default:
        break;
    }
    const ssize_t step = static_cast<ssize_t>(NLMSG_ALIGN(header->nlmsg_len));
    if (step >= remaining) break;
    cursor += step;
    remaining -= step;
  }
}

void NetlinkModule::NoteKernelMessage(nlmsghdr const* header) {
  switch (header->nlmsg_type) {
    case RTM_NEWLINK:
    case RTM_DELLINK: {
      if (header->nlmsg_len < NLMSG_LENGTH(sizeof(ifinfomsg))) return;
      ifinfomsg info;
      std::memcpy(&info, NLMSG_DATA(header), sizeof info);
      if (header->nlmsg_type == RTM_DELLINK) {
        _known.links.erase(info.ifi_index);
        _indexNames.erase(info.ifi_index);
      } else {
        std::string& stored = _known.links[info.ifi_index];
        stored.assign(reinterpret_cast<char const*>(header), header->nlmsg_len);
        const std::string name = StoredLinkName(stored);
        if (name.empty()) {
          _indexNames.erase(info.ifi_index);
        } else {
          _indexNames[info.ifi_index] = name;
        }
      }
      return;
    }
    case RTM_NEWADDR:
    case RTM_DELADDR: {
      const std::string key = AddressKey(header);
      if (key.empty()) return;
      if (header->nlmsg_type == RTM_DELADDR) {
        _known.addresses.erase(key);
      } else {
        _known.addresses[key].assign(reinterpret_cast<char const*>(header), header->nlmsg_len);
      }
      return;
    }
    case RTM_NEWROUTE:
    case RTM_DELROUTE: {
      const std::string key = RouteKey(header);
      if (key.empty()) return;
      if (header->nlmsg_type == RTM_DELROUTE) {
        _known.routes.erase(key);
      } else {
        _known.routes[key].assign(reinterpret_cast<char const*>(header), header->nlmsg_len);
      }
      return;
    }
    default:
      return;
  }
}

std::string NetlinkModule::RouteKey(nlmsghdr const* header) {
  if (header->nlmsg_len < NLMSG_LENGTH(sizeof(rtmsg))) return "";
  rtmsg info;
  std::memcpy(&info, NLMSG_DATA(header), sizeof info);
  if (info.rtm_family != AF_INET || info.rtm_table != RT_TABLE_MAIN) return "";
  uint32_t dst = 0;
  uint32_t priority = 0;
  char const* base = reinterpret_cast<char const*>(header);
  std::size_t offset = NLMSG_LENGTH(sizeof(rtmsg));
  int remaining = static_cast<int>(header->nlmsg_len) - static_cast<int>(offset);
  while (remaining >= static_cast<int>(sizeof(rtattr))) {
    rtattr attr;
    std::memcpy(&attr, base + offset, sizeof attr);
    if (attr.rta_len < sizeof(rtattr) || static_cast<int>(attr.rta_len) > remaining) break;
    if (RTA_PAYLOAD(&attr) >= 4) {
      if (attr.rta_type == RTA_DST) std::memcpy(&dst, base + offset + RTA_LENGTH(0), 4);
      if (attr.rta_type == RTA_PRIORITY) std::memcpy(&priority, base + offset + RTA_LENGTH(0), 4);
    }
    const int step = static_cast<int>(RTA_ALIGN(attr.rta_len));
    remaining -= step;
    offset += static_cast<std::size_t>(step);
  }
  // What tells routes of the main table apart: destination, length, TOS, metric, type.
  std::string key;
  key.push_back(static_cast<char>(info.rtm_dst_len));
  key.push_back(static_cast<char>(info.rtm_tos));
  key.push_back(static_cast<char>(info.rtm_type));
  key.append(reinterpret_cast<char const*>(&dst), sizeof dst);
  key.append(reinterpret_cast<char const*>(&priority), sizeof priority);
  return key;
}

std::string NetlinkModule::AddressKey(nlmsghdr const* header) {
  if (header->nlmsg_len < NLMSG_LENGTH(sizeof(ifaddrmsg))) return "";
  ifaddrmsg info;
  std::memcpy(&info, NLMSG_DATA(header), sizeof info);
  const std::size_t size = info.ifa_family == AF_INET ? 4 : info.ifa_family == AF_INET6 ? 16 : 0;
  if (size == 0) return "";
  char const* local = nullptr;
  char const* address = nullptr;
  char const* base = reinterpret_cast<char const*>(header);
  std::size_t offset = NLMSG_LENGTH(sizeof(ifaddrmsg));
  int remaining = static_cast<int>(header->nlmsg_len) - static_cast<int>(offset);
  while (remaining >= static_cast<int>(sizeof(rtattr))) {
    rtattr attr;
    std::memcpy(&attr, base + offset, sizeof attr);
    if (attr.rta_len < sizeof(rtattr) || static_cast<int>(attr.rta_len) > remaining) break;
    if (RTA_PAYLOAD(&attr) >= size) {
      if (attr.rta_type == IFA_LOCAL && local == nullptr) local = base + offset + RTA_LENGTH(0);
      if (attr.rta_type == IFA_ADDRESS && address == nullptr) {
        address = base + offset + RTA_LENGTH(0);
      }
    }
    const int step = static_cast<int>(RTA_ALIGN(attr.rta_len));
    remaining -= step;
    offset += static_cast<std::size_t>(step);
  }
  char const* chosen = local != nullptr ? local : address;
  if (chosen == nullptr) return "";
  std::string key;
  key.reserve(6 + size);
  key.push_back(static_cast<char>(info.ifa_family));
  key.append(reinterpret_cast<char const*>(&info.ifa_index), sizeof info.ifa_index);
  key.append(chosen, size);
  if (info.ifa_family == AF_INET) key.push_back(static_cast<char>(info.ifa_prefixlen));
  return key;
}

int NetlinkModule::ReadKernelState(KernelState& state) {
  const int fd = socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC, NETLINK_ROUTE);
  if (fd < 0) {
    const int err = errno;
    VORN_LOG(LOG_ERR, "Failed to open a netlink socket with err=[%d][%s]", err,
             std::strerror(err));
    return -1;
  }
  struct timeval timeout = {kDumpTimeoutSeconds, 0};
  setsockopt(fd, SOL_SOCKET, SO_RCVTIMEO, &timeout, sizeof timeout);
  struct sockaddr_nl self;
  std::memset(&self, 0, sizeof self);
  self.nl_family = AF_NETLINK;
  if (bind(fd, reinterpret_cast<sockaddr*>(&self), sizeof self) != 0) {
    const int err = errno;
    VORN_LOG(LOG_ERR, "Failed to bind a netlink socket with err=[%d][%s]", err,
             std::strerror(err));
    close(fd);
    return -1;
  }
  std::vector<char> buffer(kRecvBufferBytes);
  uint32_t seq = static_cast<uint32_t>(MonotonicMs());
  int result = -1;
  for (int attempt = 0; attempt < kDumpAttempts && result != 0; ++attempt) {
    KernelState read;
    std::vector<std::string> order;
    int links = ReadDump(fd, RTM_GETLINK, ++seq, buffer, read, &order);
    if (links < 0) break;
    if (links > 0) continue;
    const int addresses = ReadDump(fd, RTM_GETADDR, ++seq, buffer, read, &order);
    if (addresses < 0) break;
    if (addresses > 0) continue;
    const int routes = ReadDump(fd, RTM_GETROUTE, ++seq, buffer, read, nullptr);
    if (routes < 0) break;
    if (routes > 0) continue;
    read.order = std::move(order);
    state = std::move(read);
    result = 0;
  }
  close(fd);
  if (result != 0) VORN_LOG(LOG_ERR, "Failed to read the kernel's links and addresses");
  return result;
}

int NetlinkModule::ResyncKernelState() {
  // What is queued is older than the state read next: dropped unread. Its changes are part of
  // the difference reported below. While the queue is not empty the kernel drops new messages
  // anyway.
  EnsureRecvArea(kRecvBufferBytes);
  long dropped = 0;
  while (dropped < kMaxDroppedDatagrams && !_stopRequested && _netlinkFd >= 0) {
    const ssize_t n = recv(_netlinkFd, _recvArea.get(), _slotBytes, MSG_DONTWAIT | MSG_TRUNC);
    if (n < 0 && (errno == ENOBUFS || errno == EINTR)) continue;
    if (n < 0) break;
    ++dropped;
  }
  KernelState now;
  if (ReadKernelState(now) != 0) return -1;
  _resyncPending = false;
  const int reported = ReportKernelChanges(now);
  // A stop in the middle left changes unreported: a module started again reads the state anew.
  if (_stopRequested) _resyncPending = true;
  VORN_LOG(LOG_INFO,
           "Netlink state read again: [%ld] queued datagrams dropped, [%d] changes reported",
           dropped, reported);
  LogView();
  return 0;
}

int NetlinkModule::ReportKernelChanges(KernelState const& now) {
  int reported = 0;
  // Links: new ones and those whose link flags or name changed, as the kernel sent them.
  for (auto const& link : now.links) {
    if (_stopRequested) break;
    auto known = _known.links.find(link.first);
    if (known != _known.links.end() &&
        (StoredLinkFlags(known->second) & kLinkFlagsMask) ==
            (StoredLinkFlags(link.second) & kLinkFlagsMask) &&
        StoredLinkName(known->second) == StoredLinkName(link.second)) {
      continue;
    }
    MessageCopy copy(link.second);
    CheckNewLinkEvent(copy.Header());
    ++reported;
  }
  // Links gone while up went down before they went: the kernel said so then.
  for (auto const& link : _known.links) {
    if (_stopRequested) break;
    if (now.links.count(link.first) != 0) continue;
    if ((StoredLinkFlags(link.second) & IFF_RUNNING) == 0) continue;
    MessageCopy copy(link.second);
    copy.Body<ifinfomsg>()->ifi_flags &= ~(IFF_UP | IFF_RUNNING | 0x10000u);
    CheckNewLinkEvent(copy.Header());
    ++reported;
  }
  // Addresses removed, then the new ones in the kernel's order.
  for (auto const& address : _known.addresses) {
    if (_stopRequested) break;
    if (now.addresses.count(address.first) != 0) continue;
    MessageCopy copy(address.second);
    copy.Header()->nlmsg_type = RTM_DELADDR;
    CheckIPChangeEvent(copy.Header());
    ++reported;
  }
  auto added = [&](std::string const& key) {
    if (_stopRequested || _known.addresses.count(key) != 0) return;
    auto it = now.addresses.find(key);
    if (it == now.addresses.end()) return;
    MessageCopy copy(it->second);
    CheckIPChangeEvent(copy.Header());
    ++reported;
  };
  if (now.order.size() == now.addresses.size()) {
    for (auto const& key : now.order) added(key);
  } else {
    for (auto const& address : now.addresses) added(address.first);
  }
  // Main-table routes removed, then those that are new or go another way.
  for (auto const& route : _known.routes) {
    if (_stopRequested) break;
    if (now.routes.count(route.first) != 0) continue;
    MessageCopy copy(route.second);
    copy.Header()->nlmsg_type = RTM_DELROUTE;
    CheckRouteChangeEvent(copy.Header());
    ++reported;
  }
  for (auto const& route : now.routes) {
    if (_stopRequested) break;
    auto known = _known.routes.find(route.first);
    if (known != _known.routes.end() && RouteWay(known->second) == RouteWay(route.second)) continue;
    MessageCopy copy(route.second);
    CheckRouteChangeEvent(copy.Header());
    ++reported;
  }
  KernelState next = now;
  _known = std::move(next);
  RebuildIndexNames();
  return reported;
}

void NetlinkModule::RebuildIndexNames() {
  _indexNames.clear();
  for (auto const& link : _known.links) {
    const std::string name = StoredLinkName(link.second);
    if (!name.empty()) _indexNames[link.first] = name;
  }
}

std::string NetlinkModule::NameOfIndex(int index) const {
  // Names change only with a link message, which updates the table; an index not in it (a
  // message handed in by hand, or the thread not running) is asked of the kernel.
  auto it = _indexNames.find(index);
  if (it != _indexNames.end()) return it->second;
  return IndexToName(index);
}

void NetlinkModule::LogView() const {
  std::set<std::string> names;
  for (auto const& e : _linkMap.Map()) names.insert(e.first);
  for (auto const& e : _ipv4Map.Map()) names.insert(e.first);
  for (auto const& e : _ipv6Map) names.insert(e.first);
  for (auto const& name : names) {
    auto v6 = _ipv6Map.find(name);
    const std::string ipv6 =
        v6 == _ipv6Map.end() ? "" : vornwireless::utils::ConvertToString(v6->second, ",");
    VORN_LOG(LOG_DEBUG, "Netlink view [%s]: link=[%s] ipv4=[%s] ipv6=[%s]", name.c_str(),
             !_linkMap.Has(name) ? "unknown" : _linkMap.Get(name) ? "up" : "down",
             _ipv4Map.Has(name) ? _ipv4Map.Get(name).c_str() : "", ipv6.c_str());
  }
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
    ifname = NameOfIndex(static_cast<int>(addrMsg->ifa_index));
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
  std::map<std::string, std::vector<std::string> >::iterator found = _ipv6Map.find(ifname);
  if (isNew) {
    std::string joined;
    if (found != _ipv6Map.end()) {
      if (vornwireless::utils::Find(ip, found->second) >= 0) return 0;
      joined = vornwireless::utils::ConvertToString(found->second, ",");
    }
    vornwireless::hook::NetIPChangeEvent(vornwireless::hook::IPTYPE_IPV6, ifname, joined, ip,
                                         prefixLength);
    _ipv6Map[ifname].push_back(ip);
    return 0;
  }
  if (found == _ipv6Map.end()) return 0;
  const int index = vornwireless::utils::Find(ip, found->second);
  if (index < 0) return 0;
  found->second.erase(found->second.begin() + index);
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
      ifname = NameOfIndex(index);
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
