// The daemon's ear on the kernel: one rtnetlink socket and one polling thread that turn link,
// address and main-table route messages into the platform's link events, the IP change hook and
// the gateway change hook. Repeats of a state, bond slaves, "tap"/"docker" interfaces and the
// passing state "running without lower-up" are not reported.
#ifndef VORNWIRELESS_NETWORK_NETLINK_NETLINK_MODULE_H
#define VORNWIRELESS_NETWORK_NETLINK_NETLINK_MODULE_H

#include <linux/netlink.h>
#include <pthread.h>

#include <map>
#include <string>
#include <vector>

#include "vornwireless/network/base_module.h"

namespace vornnetwork {
namespace network {
namespace module {

// Per-interface values with a default for interfaces not seen yet.
template <typename T>
class IFMap {
 public:
  explicit IFMap(T const& defaultValue) : _default(defaultValue) {}

  // Inserts the pair, or overwrites an existing entry whose value differs.
  void Set(std::string const& name, T const& value) {
    typename std::map<std::string, T>::iterator it = _map.find(name);
    if (it == _map.end()) {
      _map.insert(std::make_pair(name, value));
    } else if (!(it->second == value)) {
      it->second = value;
    }
  }
  // The entry of name, or the default value when there is none.
  T const& Get(std::string const& name) const {
    typename std::map<std::string, T>::const_iterator it = _map.find(name);
    return it == _map.end() ? _default : it->second;
  }
  bool Has(std::string const& name) const { return _map.find(name) != _map.end(); }
  T const& Default() const { return _default; }
  std::map<std::string, T> const& Map() const { return _map; }
  std::size_t Size() const { return _map.size(); }

 private:
  T _default;
  std::map<std::string, T> _map;
};

class NetlinkModule : public BaseModule {
 public:
  // Link, IPv4 address, IPv4 route and IPv6 address groups (IPv6 routes are not watched).
  static const unsigned int kNetlinkGroups = 0x151;

  NetlinkModule();
  ~NetlinkModule() override;

  static BaseModule* Create();

  // Opens and binds the socket. 0; -1 (a socket that was opened stays open until
  // TerminateModule).
  int InitialModule() override;
  // Cancels the polling thread (it stops only while waiting in select), joins it and closes the
  // socket. Always 0.
  int TerminateModule() override;
  // Starts the polling thread; a thread that cannot be created is logged and still gives 0.
  int StartModule() override;
  // The polling thread's body: fills the maps, then waits for messages for ever.
  virtual int StartPolling();

  // One datagram from the socket, dispatched message by message. 0; -1 when recvmsg failed.
  int AnalysisNetlinkMessage();
  // The checks of one message; -1 when the message is not looked at.
  int CheckNewLinkEvent(nlmsghdr* header);
  int CheckIPChangeEvent(nlmsghdr* header);
  int CheckRouteChangeEvent(nlmsghdr* header);
  // Link state of one interface from its kernel flags, with bond and OVS bond rules.
  int HandleLinkEvent(std::string const& ifname, short flags);
  // Reports a real change of a non-slave; records the state in every case. True for link down.
  bool OnInterfaceStatusChange(std::string const& ifname, bool linkUp, bool isSlave);
  // Address changes of one interface; both give 0.
  int ProcessIPv4Event(std::string const& ifname, std::string const& ip, int prefixLength,
                       bool isNew);
  int ProcessIPv6Event(std::string const& ifname, std::string const& ip, int prefixLength,
                       bool isNew);
  // Fills the link and IPv4 maps with the present state. 0; -1.
  int InitInterface();
  // Asks for a new DHCP lease on ifname. 0 (also for a "wlan" name); -1.
  int RequestDHCPIP(std::string const& ifname) const;

  // Read-only views for diagnostics.
  int GetNetlinkFd() const { return _netlinkFd; }
  IFMap<std::string> const& GetIPv4Map() const { return _ipv4Map; }
  std::map<std::string, std::vector<std::string> > const& GetIPv6Map() const { return _ipv6Map; }
  IFMap<bool> const& GetLinkMap() const { return _linkMap; }

 private:
  static void* PollingThread(void* arg);
  // The master of the OVS bond that slave belongs to and the state to report for it.
  // 0 when there is something to report, -1 when not.
  int GetOVSMasterStatus(std::string const& slave, bool slaveUp, std::string& master,
                         bool& masterUp);

  int _netlinkFd;
  pthread_t _pollingThread;
  IFMap<std::string> _ipv4Map;
  std::map<std::string, std::vector<std::string> > _ipv6Map;
  IFMap<bool> _linkMap;
  bool _threadStarted;  // _pollingThread holds a thread that was not joined yet
};

}  // namespace module
}  // namespace network
}  // namespace vornnetwork

#endif
