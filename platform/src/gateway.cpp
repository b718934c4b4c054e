// The IPv4 default gateway over rtnetlink, the configured one in a key file of ours.
#include "vornplatform/gateway.h"

#include <arpa/inet.h>
#include <linux/netlink.h>
#include <linux/rtnetlink.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

#include "internal.h"
#include "vornplatform/err.h"
#include "vornplatform/file.h"
#include "vornplatform/log.h"

using vornplatform::internal::HasText;
using vornplatform::internal::NoThrow;

namespace {

// One IPv4 default route of the main table, as the kernel reported it.
struct DefaultRoute {
  std::vector<char> message;  // the whole RTM_NEWROUTE message (header included)
  std::string gateway;        // "" for a route over a device alone
  unsigned int metric = 0;
};

class NetlinkSocket {
 public:
  NetlinkSocket() {
    fd_ = socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC, NETLINK_ROUTE);
    if (fd_ < 0) return;
    struct sockaddr_nl local;
    std::memset(&local, 0, sizeof local);
    local.nl_family = AF_NETLINK;
    if (bind(fd_, reinterpret_cast<struct sockaddr*>(&local), sizeof local) != 0) {
      close(fd_);
      fd_ = -1;
    }
  }
  ~NetlinkSocket() {
    if (fd_ >= 0) close(fd_);
  }
  NetlinkSocket(const NetlinkSocket&) = delete;
  NetlinkSocket& operator=(const NetlinkSocket&) = delete;
  bool ok() const { return fd_ >= 0; }

  bool Send(struct nlmsghdr* msg) {
    msg->nlmsg_seq = ++seq_;
    struct sockaddr_nl kernel;
    std::memset(&kernel, 0, sizeof kernel);
    kernel.nl_family = AF_NETLINK;
    for (;;) {
      ssize_t n = sendto(fd_, msg, msg->nlmsg_len, 0, reinterpret_cast<struct sockaddr*>(&kernel),
                         sizeof kernel);
      if (n >= 0) return true;
      if (errno != EINTR) return false;
    }
  }

  // Reads the answers to the last request. For a dump every message goes to onMessage until
  // NLMSG_DONE; for an acknowledged request the result is the kernel's error (0 = done).
  // Returns 0, or a negative errno.
  template <typename F>
  int Receive(F&& onMessage) {
    std::vector<char> buf(32768);
    for (;;) {
      struct iovec iov = {buf.data(), buf.size()};
      struct sockaddr_nl from;
      struct msghdr mh;
      std::memset(&mh, 0, sizeof mh);
      mh.msg_name = &from;
      mh.msg_namelen = sizeof from;
      mh.msg_iov = &iov;
      mh.msg_iovlen = 1;
      ssize_t n = recvmsg(fd_, &mh, 0);
      if (n < 0) {
        if (errno == EINTR) continue;
        return -errno;
      }
      if (n == 0 || (mh.msg_flags & MSG_TRUNC)) return -EIO;
      int len = static_cast<int>(n);
      // NLMSG_OK spelled out: the macro compares the unsigned length with the signed rest.
      for (struct nlmsghdr* h = reinterpret_cast<struct nlmsghdr*>(buf.data());
           len >= static_cast<int>(sizeof(struct nlmsghdr)) &&
           h->nlmsg_len >= sizeof(struct nlmsghdr) && h->nlmsg_len <= static_cast<unsigned>(len);
           h = NLMSG_NEXT(h, len)) {
        if (h->nlmsg_seq != seq_) continue;
        if (h->nlmsg_type == NLMSG_DONE) return 0;
        if (h->nlmsg_type == NLMSG_ERROR) {
          if (h->nlmsg_len < NLMSG_LENGTH(sizeof(struct nlmsgerr))) return -EIO;
          const struct nlmsgerr* e = static_cast<const struct nlmsgerr*>(NLMSG_DATA(h));
          return e->error;  // 0 is the acknowledgement
        }
        onMessage(h);
      }
    }
  }

 private:
  int fd_ = -1;
  unsigned int seq_ = 0;
};

bool ValidBuffer(const char* buf, int size) { return buf != nullptr && size > 0; }

// The text into the caller's buffer; -1 (TOO_LONG) when it does not fit.
int CopyOut(const std::string& text, char* buf, int size) {
  if (text.size() + 1 > static_cast<std::size_t>(size)) {
    buf[0] = '\0';
    VLIBC_ERR_SET(VLIBC_ERR_TOO_LONG);
    return -1;
  }
  std::memcpy(buf, text.c_str(), text.size() + 1);
  return 0;
}

bool IsIPv4(const char* text) {
  struct in_addr a;
  return text != nullptr && inet_pton(AF_INET, text, &a) == 1;
}

// The IPv4 default routes of the main table, lowest metric first. 0, or -1 (error recorded).
int DumpDefaultRoutes(NetlinkSocket& nl, std::vector<DefaultRoute>& routes) {
  struct {
    struct nlmsghdr h;
    struct rtmsg r;
  } req;
  std::memset(&req, 0, sizeof req);
  req.h.nlmsg_len = NLMSG_LENGTH(sizeof(struct rtmsg));
  req.h.nlmsg_type = RTM_GETROUTE;
  req.h.nlmsg_flags = NLM_F_REQUEST | NLM_F_DUMP;
  req.r.rtm_family = AF_INET;
  if (!nl.Send(&req.h)) {
    VLIBC_ERR_SET(VLIBC_ERR_IO);
    return -1;
  }
  const int rc = nl.Receive([&](struct nlmsghdr* h) {
    if (h->nlmsg_type != RTM_NEWROUTE || h->nlmsg_len < NLMSG_LENGTH(sizeof(struct rtmsg))) return;
    const struct rtmsg* r = static_cast<const struct rtmsg*>(NLMSG_DATA(h));
    if (r->rtm_family != AF_INET || r->rtm_dst_len != 0 || r->rtm_type != RTN_UNICAST) return;
    unsigned int table = r->rtm_table;
    DefaultRoute route;
    int alen = static_cast<int>(RTM_PAYLOAD(h));
    for (const struct rtattr* a = RTM_RTA(r); RTA_OK(a, alen); a = RTA_NEXT(a, alen)) {
      if (a->rta_type == RTA_TABLE && RTA_PAYLOAD(a) >= 4) {
        std::memcpy(&table, RTA_DATA(a), 4);
      } else if (a->rta_type == RTA_PRIORITY && RTA_PAYLOAD(a) >= 4) {
        std::memcpy(&route.metric, RTA_DATA(a), 4);
      } else if (a->rta_type == RTA_GATEWAY && RTA_PAYLOAD(a) >= 4) {
        char text[INET_ADDRSTRLEN];
        if (inet_ntop(AF_INET, RTA_DATA(a), text, sizeof text) != nullptr) route.gateway = text;
      }
    }
    if (table != RT_TABLE_MAIN) return;
    const char* begin = reinterpret_cast<const char*>(h);
    route.message.assign(begin, begin + h->nlmsg_len);
    std::size_t at = routes.size();
    while (at > 0 && routes[at - 1].metric > route.metric) --at;
    routes.insert(routes.begin() + static_cast<long>(at), std::move(route));
  });
  if (rc != 0) {
    errno = -rc;
    VLIBC_ERR_SET(VLIBC_ERR_IO);
    return -1;
  }
  return 0;
}

// Sends one acknowledged request. 0, or -1 (error recorded with the kernel's errno).
int Request(NetlinkSocket& nl, struct nlmsghdr* msg) {
  msg->nlmsg_flags |= NLM_F_REQUEST | NLM_F_ACK;
  if (!nl.Send(msg)) {
    VLIBC_ERR_SET(VLIBC_ERR_IO);
    return -1;
  }
  const int rc = nl.Receive([](struct nlmsghdr*) {});
  if (rc != 0) {
    errno = -rc;
    VLIBC_ERR_SET(rc == -ENETUNREACH || rc == -EINVAL ? VLIBC_ERR_BAD_PARAMETER : VLIBC_ERR_IO);
    return -1;
  }
  return 0;
}

std::string RememberedGateway() {
  std::string text;
  if (vornplatform::internal::ReadWholeFile(VORN_GATEWAY_DELETED_FILE, text, 4096) != 0) return "";
  while (!text.empty() && (text.back() == '\n' || text.back() == ' ')) text.pop_back();
  return IsIPv4(text.c_str()) ? text : "";
}

int Remember(const std::string& gateway) {
  if (gateway.empty()) {
    if (unlink(VORN_GATEWAY_DELETED_FILE) != 0 && errno != ENOENT) {
      VLIBC_ERR_SET(VLIBC_ERR_IO);
      return -1;
    }
    return 0;
  }
  const std::string path = VORN_GATEWAY_DELETED_FILE;
  if (vornplatform::internal::MakeDirs(path.substr(0, path.rfind('/')), 0755) != 0 ||
      vornplatform::internal::AtomicWriteFile(path, gateway + "\n", 0644, false) != 0) {
    VLIBC_ERR_SET(VLIBC_ERR_IO);
    return -1;
  }
  return 0;
}

int DeleteDefaultRoutes(NetlinkSocket& nl, std::string* deletedGateway) {
  std::vector<DefaultRoute> routes;
  if (DumpDefaultRoutes(nl, routes) != 0) return -1;
  for (auto& route : routes) {
    if (deletedGateway != nullptr && deletedGateway->empty()) *deletedGateway = route.gateway;
    struct nlmsghdr* h = reinterpret_cast<struct nlmsghdr*>(route.message.data());
    h->nlmsg_type = RTM_DELROUTE;
    h->nlmsg_flags = 0;
    h->nlmsg_pid = 0;
    if (Request(nl, h) != 0) {
      // Gone meanwhile is what we wanted.
      if (VLIBCErrGetErrno() == ESRCH) continue;
      VORN_LOG(LOG_ERR, "Failed to delete default route via [%s]: %s", route.gateway.c_str(),
               std::strerror(VLIBCErrGetErrno()));
      return -1;
    }
  }
  return 0;
}

int AddDefaultRoute(NetlinkSocket& nl, const char* gateway) {
  struct {
    struct nlmsghdr h;
    struct rtmsg r;
    char attrs[64];
  } req;
  std::memset(&req, 0, sizeof req);
  req.h.nlmsg_len = NLMSG_LENGTH(sizeof(struct rtmsg));
  req.h.nlmsg_type = RTM_NEWROUTE;
  req.h.nlmsg_flags = NLM_F_CREATE | NLM_F_REPLACE;
  req.r.rtm_family = AF_INET;
  req.r.rtm_table = RT_TABLE_MAIN;
  req.r.rtm_protocol = RTPROT_BOOT;
  req.r.rtm_scope = RT_SCOPE_UNIVERSE;
  req.r.rtm_type = RTN_UNICAST;
  struct rtattr* a = reinterpret_cast<struct rtattr*>(reinterpret_cast<char*>(&req) +
                                                      NLMSG_ALIGN(req.h.nlmsg_len));
  a->rta_type = RTA_GATEWAY;
  a->rta_len = RTA_LENGTH(4);
  struct in_addr addr;
  inet_pton(AF_INET, gateway, &addr);
  std::memcpy(RTA_DATA(a), &addr, 4);
  req.h.nlmsg_len = NLMSG_ALIGN(req.h.nlmsg_len) + RTA_ALIGN(a->rta_len);
  return Request(nl, &req.h);
}

}  // namespace

int VORNNetDefaultGatewayGet(char* buf, int size) {
  if (!ValidBuffer(buf, size)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  buf[0] = '\0';
  return NoThrow(-1, [&]() -> int {
    NetlinkSocket nl;
    if (!nl.ok()) {
      VLIBC_ERR_SET(VLIBC_ERR_IO);
      return -1;
    }
    std::vector<DefaultRoute> routes;
    if (DumpDefaultRoutes(nl, routes) != 0) return -1;
    for (const auto& route : routes) {
      if (!route.gateway.empty()) return CopyOut(route.gateway, buf, size);
    }
    return CopyOut(RememberedGateway(), buf, size);
  });
}

int VORNNetDefaultGatewayGetConf(char* buf, int size) {
  if (!ValidBuffer(buf, size)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  buf[0] = '\0';
  char value[64];
  if (VLIBCFileGetKeyValue(VORN_GATEWAY_CONF_FILE, VORN_GATEWAY_CONF_KEY, value, sizeof value, 0) <
      0) {
    return -1;
  }
  return NoThrow(-1, [&]() -> int { return CopyOut(value, buf, size); });
}

int VORNNetDefaultGatewaySet(const char* gateway) {
  if (HasText(gateway) && !IsIPv4(gateway)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return NoThrow(-1, [&]() -> int {
    NetlinkSocket nl;
    if (!nl.ok()) {
      VLIBC_ERR_SET(VLIBC_ERR_IO);
      return -1;
    }
    if (gateway == nullptr) {
      std::string deleted;
      if (DeleteDefaultRoutes(nl, &deleted) != 0) return -1;
      // Nothing deleted keeps what an earlier deletion remembered.
      return deleted.empty() ? 0 : Remember(deleted);
    }
    if (*gateway == '\0') {
      if (DeleteDefaultRoutes(nl, nullptr) != 0) return -1;
    } else if (AddDefaultRoute(nl, gateway) != 0) {
      return -1;
    }
    return Remember("");
  });
}

int VORNNetDefaultGatewaySetConf(const char* gateway) {
  if (HasText(gateway) && !IsIPv4(gateway)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return NoThrow(-1, [&]() -> int {
    const std::string path = VORN_GATEWAY_CONF_FILE;
    if (vornplatform::internal::MakeDirs(path.substr(0, path.rfind('/')), 0755) != 0) {
      VLIBC_ERR_SET(VLIBC_ERR_IO);
      return -1;
    }
    return VLIBCFileSetKeyValue(VORN_GATEWAY_CONF_FILE, VORN_GATEWAY_CONF_KEY,
                                gateway == nullptr ? "" : gateway, "%s=%s\n") < 0
               ? -1
               : 0;
  });
}
