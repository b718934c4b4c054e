// The link watcher's message handling: the input is one datagram sent to the watcher's own
// rtnetlink socket and read by it as a kernel datagram would be.
#ifndef VORN_FUZZ_ENTRIES_NETLINK_DATAGRAMS_H
#define VORN_FUZZ_ENTRIES_NETLINK_DATAGRAMS_H

#include <linux/netlink.h>
#include <linux/rtnetlink.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cstring>
#include <filesystem>
#include <string>

#include "entries/fuzz_input.h"
#include "vornwireless/network/netlink/netlink_module.h"

namespace vornfuzz {

// Nothing may run behind the events (no hook scripts, no platform actions): a storm of inputs
// then costs no process per event. Only inside the sandbox.
inline void RemoveEventPrograms() {
  RequireSandbox();
  std::error_code ec;
  std::filesystem::remove_all("/usr/vorn/etc/hooks", ec);
  std::filesystem::remove_all("/usr/vorn/libexec/platform", ec);
}

// A sender bound once; it addresses the module's socket by its port id.
class DatagramSender {
 public:
  DatagramSender() : _fd(socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC, NETLINK_ROUTE)) {
    sockaddr_nl self;
    std::memset(&self, 0, sizeof self);
    self.nl_family = AF_NETLINK;
    Require(_fd >= 0 && bind(_fd, reinterpret_cast<sockaddr*>(&self), sizeof self) == 0,
            "a netlink sender");
  }
  ~DatagramSender() { close(_fd); }
  bool Send(int moduleFd, const uint8_t* data, size_t size) {
    sockaddr_nl target;
    std::memset(&target, 0, sizeof target);
    socklen_t len = sizeof target;
    if (getsockname(moduleFd, reinterpret_cast<sockaddr*>(&target), &len) != 0) return false;
    sockaddr_nl to;
    std::memset(&to, 0, sizeof to);
    to.nl_family = AF_NETLINK;
    to.nl_pid = target.nl_pid;
    return sendto(_fd, data, size, 0, reinterpret_cast<sockaddr*>(&to), sizeof to) ==
           static_cast<ssize_t>(size);
  }

 private:
  int _fd;
};

// Sends the datagram and lets the module read everything that is queued (the kernel may have
// queued messages of its own). An empty input sends nothing.
inline void FeedDatagram(vornnetwork::network::module::NetlinkModule& module,
                         DatagramSender& sender, const uint8_t* data, size_t size) {
  if (size == 0) return;
  const int fd = module.GetNetlinkFd();
  Require(sender.Send(fd, data, size), "the datagram is sent");
  pollfd p = {fd, POLLIN, 0};
  while (poll(&p, 1, 0) > 0) {
    Require(module.AnalysisNetlinkMessage() == 0, "a queued datagram is read");
  }
}

}  // namespace vornfuzz

#endif
