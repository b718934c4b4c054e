// A LAN for the device list tests: the sandbox's veth lan0 (10.200.1.2 here, 10.200.1.1 on its
// peer host) enslaved to a bridge br0 that carries the address, eth0 (10.200.2.x) as the WAN with
// the default route, and peer programs started inside the peer hosts.
#ifndef VORN_TESTS_UNIT_NETWORK_DEVICELIST_LAN_FIXTURE_H
#define VORN_TESTS_UNIT_NETWORK_DEVICELIST_LAN_FIXTURE_H

#include <sys/types.h>

#include <string>
#include <vector>

namespace vorntest {

// Builds br0 over lan0 and the WAN default route via eth0's peer. False with a reason.
bool SetUpRouterLan(std::string* why);
// The peer host's address of veth NAME (from the sandbox), "" outside one.
std::string PeerAddr(std::string const& veth);
// The peer host's MAC of veth NAME (as the kernel prints it, lower case).
std::string PeerMac(std::string const& veth);
// Sends one ping from here to ip (the answer fills the neighbour table); the ping's status.
int PingOnce(std::string const& ip);
// Writes net_topology into /etc/vorninfo.conf ("router", "bridge", "client").
bool SetTopology(std::string const& topology);
// The neighbour table line of ip in /proc/net/arp, "" when absent.
std::string ArpLine(std::string const& ip);

// A program running in the peer host of veth NAME (or here, for an empty NAME) until the object
// goes; its stdout and stderr go to a file. Started waits for `readyText` in that output.
class PeerProcess {
 public:
  PeerProcess(std::string const& veth, std::vector<std::string> const& argv,
              std::string const& readyText = "", int readySeconds = 10);
  ~PeerProcess();
  PeerProcess(PeerProcess const&) = delete;
  PeerProcess& operator=(PeerProcess const&) = delete;
  bool ready() const { return _ready; }
  std::string Output() const;  // what it printed so far

 private:
  pid_t _pid = -1;
  bool _ready = false;
  std::string _log;
};

std::string DeviceListFixture(std::string const& name);  // tests/fixtures/<name>

}  // namespace vorntest

#endif
