// Helpers for the link watcher's tests: rtnetlink messages built by hand, a way to hand them to
// the module's own socket, recording link-event actions, and a watch on the processing flag.
#ifndef VORN_TESTS_UNIT_NETWORK_NETLINK_NETLINK_TEST_SUPPORT_H
#define VORN_TESTS_UNIT_NETWORK_NETLINK_NETLINK_TEST_SUPPORT_H

#include <arpa/inet.h>
#include <linux/if_addr.h>
#include <linux/netlink.h>
#include <linux/rtnetlink.h>
#include <net/if.h>
#include <poll.h>
#include <sys/inotify.h>
#include <sys/socket.h>
#include <unistd.h>

#include <chrono>
#include <cstdint>
#include <cstring>
#include <functional>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include "support/test_util.h"

namespace vorntest {

namespace netlink_constants {
const char kFile[] = "network/netlink/netlink_module.cpp";  // the watcher's log lines
const char kScripts[] = "/etc/sysconfig/network-scripts";
const unsigned int kLowerUp = 0x10000;                     // IFF_LOWER_UP
const unsigned int kUp = IFF_UP | IFF_RUNNING | kLowerUp;  // link up as the kernel says it
}  // namespace netlink_constants

// One netlink message: header, fixed body, attributes; lengths filled in as it grows.
class NlMessage {
 public:
  explicit NlMessage(uint16_t type) : bytes_(NLMSG_HDRLEN, '\0') {
    nlmsghdr h;
    std::memset(&h, 0, sizeof h);
    h.nlmsg_type = type;
    std::memcpy(&bytes_[0], &h, sizeof h);
  }
  template <typename T>
  NlMessage& Body(T const& body) {
    Append(&body, sizeof body);
    return *this;
  }
  NlMessage& Attr(uint16_t type, void const* data, std::size_t size) {
    rtattr a;
    a.rta_type = type;
    a.rta_len = static_cast<unsigned short>(RTA_LENGTH(size));
    Append(&a, sizeof a);
    Append(data, size);
    return *this;
  }
  NlMessage& Attr(uint16_t type, std::string const& text) {  // NUL-terminated string
    return Attr(type, text.c_str(), text.size() + 1);
  }
  NlMessage& Attr4(uint16_t type, std::string const& ip) {
    in_addr a;
    inet_pton(AF_INET, ip.c_str(), &a);
    return Attr(type, &a, sizeof a);
  }
  NlMessage& Attr6(uint16_t type, std::string const& ip) {
    in6_addr a;
    inet_pton(AF_INET6, ip.c_str(), &a);
    return Attr(type, &a, sizeof a);
  }
  NlMessage& AttrU32(uint16_t type, uint32_t value) { return Attr(type, &value, sizeof value); }
  // The message as bytes (nlmsg_len set).
  std::string Bytes() const {
    std::string out = bytes_;
    const uint32_t len = static_cast<uint32_t>(out.size());
    std::memcpy(&out[0], &len, sizeof len);
    return out;
  }
  // An aligned copy to hand to a Check* operation.
  nlmsghdr* Header() {
    const std::string b = Bytes();
    aligned_.assign((b.size() + 7) / 8, 0);
    std::memcpy(aligned_.data(), b.data(), b.size());
    return reinterpret_cast<nlmsghdr*>(aligned_.data());
  }

 private:
  void Append(void const* data, std::size_t size) {
    bytes_.append(static_cast<char const*>(data), size);
    bytes_.resize(NLMSG_ALIGN(bytes_.size()), '\0');
  }
  std::string bytes_;
  std::vector<uint64_t> aligned_;
};

inline NlMessage LinkMessage(std::string const& name, unsigned int flags,
                             uint16_t type = RTM_NEWLINK, int index = 0) {
  ifinfomsg info;
  std::memset(&info, 0, sizeof info);
  info.ifi_family = AF_UNSPEC;
  info.ifi_index = index;
  info.ifi_flags = flags;
  info.ifi_change = 0xffffffff;
  NlMessage m(type);
  m.Body(info).AttrU32(IFLA_MTU, 1500).Attr(IFLA_IFNAME, name);
  return m;
}

// An address message; label empty: no IFA_LABEL. local false: the address goes in IFA_ADDRESS only.
inline NlMessage AddrMessage(uint16_t type, int family, std::string const& ifname,
                             std::string const& ip, int prefix, std::string const& label = "",
                             bool local = true) {
  ifaddrmsg a;
  std::memset(&a, 0, sizeof a);
  a.ifa_family = static_cast<unsigned char>(family);
  a.ifa_prefixlen = static_cast<unsigned char>(prefix);
  a.ifa_index = if_nametoindex(ifname.c_str());
  NlMessage m(type);
  m.Body(a);
  if (family == AF_INET6) {
    m.Attr6(IFA_ADDRESS, ip);
  } else {
    m.Attr4(IFA_ADDRESS, ip);
    if (local) m.Attr4(IFA_LOCAL, ip);
  }
  if (!label.empty()) m.Attr(IFA_LABEL, label);
  return m;
}

inline NlMessage RouteMessage(uint16_t type, unsigned char table, std::string const& oif,
                              std::string const& dst, int dstLen, std::string const& gateway) {
  rtmsg r;
  std::memset(&r, 0, sizeof r);
  r.rtm_family = AF_INET;
  r.rtm_dst_len = static_cast<unsigned char>(dstLen);
  r.rtm_table = table;
  r.rtm_protocol = RTPROT_BOOT;
  r.rtm_scope = RT_SCOPE_UNIVERSE;
  r.rtm_type = RTN_UNICAST;
  NlMessage m(type);
  m.Body(r).AttrU32(RTA_TABLE, table);
  if (!dst.empty()) m.Attr4(RTA_DST, dst);
  if (!gateway.empty()) m.Attr4(RTA_GATEWAY, gateway);
  if (!oif.empty()) m.AttrU32(RTA_OIF, if_nametoindex(oif.c_str()));
  return m;
}

// Sends one datagram (any number of messages back to back) to the netlink socket moduleFd.
inline bool SendToSocket(int moduleFd, std::string const& datagram) {
  sockaddr_nl target;
  std::memset(&target, 0, sizeof target);
  socklen_t len = sizeof target;
  if (getsockname(moduleFd, reinterpret_cast<sockaddr*>(&target), &len) != 0) return false;
  const int fd = socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC, NETLINK_ROUTE);
  if (fd < 0) return false;
  sockaddr_nl self;
  std::memset(&self, 0, sizeof self);
  self.nl_family = AF_NETLINK;
  bool ok = bind(fd, reinterpret_cast<sockaddr*>(&self), sizeof self) == 0;
  sockaddr_nl to;
  std::memset(&to, 0, sizeof to);
  to.nl_family = AF_NETLINK;
  to.nl_pid = target.nl_pid;
  ok = ok && sendto(fd, datagram.data(), datagram.size(), 0, reinterpret_cast<sockaddr*>(&to),
                    sizeof to) == static_cast<ssize_t>(datagram.size());
  close(fd);
  return ok;
}

// --- link events ------------------------------------------------------------------------------

const char kLinkRecord[] = "/run/link-events.txt";
const char kLinkFlag[] = "/tmp/.net_link_is_processing";

// Installs VLIBNetIfLinkUpEvent and VLIBNetIfLinkDownEvent actions that append
// "<up|down> <argv...> flag=<0|1>" to kLinkRecord, the flag telling whether the processing
// flag file existed while the action ran. delay: seconds the action sleeps before recording.
inline bool InstallLinkRecorders(std::string const& delay = "") {
  const std::string dir = "/usr/vorn/libexec/platform";
  if (Run({"/bin/mkdir", "-p", dir}).status != 0) return false;
  for (const char* kind : {"up", "down"}) {
    const std::string script = std::string("#!/bin/sh\n") +
                               (delay.empty() ? "" : "sleep " + delay + "\n") +
                               "if [ -e " + kLinkFlag + " ]; then f=1; else f=0; fi\n"
                               "echo \"" + kind + " $* flag=$f\" >> " + kLinkRecord + "\n";
    const std::string name = std::string(kind) == "up" ? "VLIBNetIfLinkUpEvent"
                                                        : "VLIBNetIfLinkDownEvent";
    if (!WriteFile(dir + "/" + name, script, 0755)) return false;
  }
  return true;
}

inline std::vector<std::string> LinkEvents() {
  std::vector<std::string> lines;
  std::istringstream in(ReadFile(kLinkRecord));
  std::string line;
  while (std::getline(in, line)) lines.push_back(line);
  return lines;
}

inline void ClearLinkEvents() { unlink(kLinkRecord); }

// Polls pred every 10 ms until it holds or the deadline passes.
inline bool WaitFor(std::function<bool()> const& pred, int timeoutMs = 5000) {
  const auto end = std::chrono::steady_clock::now() + std::chrono::milliseconds(timeoutMs);
  while (std::chrono::steady_clock::now() < end) {
    if (pred()) return true;
    std::this_thread::sleep_for(std::chrono::milliseconds(10));
  }
  return pred();
}

// Watches /tmp for the processing flag file appearing and going away.
class FlagWatch {
 public:
  FlagWatch() {
    fd_ = inotify_init1(IN_NONBLOCK | IN_CLOEXEC);
    if (fd_ >= 0) inotify_add_watch(fd_, "/tmp", IN_CREATE | IN_MOVED_TO | IN_DELETE);
  }
  ~FlagWatch() {
    if (fd_ >= 0) close(fd_);
  }
  FlagWatch(FlagWatch const&) = delete;
  FlagWatch& operator=(FlagWatch const&) = delete;
  // "set" and "unset" for each appearance and removal of the flag seen since the last call.
  std::vector<std::string> Events() {
    std::vector<std::string> out;
    alignas(inotify_event) char buf[8192];
    for (;;) {
      const ssize_t n = read(fd_, buf, sizeof buf);
      if (n <= 0) break;
      for (char* p = buf; p < buf + n;) {
        inotify_event* e = reinterpret_cast<inotify_event*>(p);
        if (e->len > 0 && std::strcmp(e->name, ".net_link_is_processing") == 0) {
          out.push_back((e->mask & IN_DELETE) != 0 ? "unset" : "set");
        }
        p += sizeof(inotify_event) + e->len;
      }
    }
    return out;
  }

 private:
  int fd_ = -1;
};

}  // namespace vorntest

#endif
