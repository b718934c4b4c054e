// The daemon's ear on the kernel: one rtnetlink socket and one polling thread that turn link,
// address and main-table route messages into the platform's link events, the IP change hook and
// the gateway change hook. Repeats of a state, bond slaves, "tap"/"docker" interfaces and the
// passing state "running without lower-up" are not reported.
//
// Nothing is missed silently: a datagram cut short (MSG_TRUNC) or events lost to a full socket
// (ENOBUFS) make the watcher read the kernel's whole link, address and route state again and
// report what changed since the state it knew last, each change as the message that would have
// told it.
// Tuning knob: the environment variable VORN_NETLINK_RCVBUF (bytes) sets the socket's receive
// buffer instead of the default 4 MiB (a small value makes overflows, and so the re-reading,
// happen; the kernel doubles the value and keeps a floor of its own).
#ifndef VORNWIRELESS_NETWORK_NETLINK_NETLINK_MODULE_H
#define VORNWIRELESS_NETWORK_NETLINK_NETLINK_MODULE_H

#include <linux/netlink.h>
#include <pthread.h>

#include <sys/types.h>

#include <atomic>
#include <map>
#include <memory>
#include <string>
#include <unordered_map>
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
  // The receive buffer a datagram is read into at first; a datagram cut short grows it.
  static const std::size_t kRecvBufferBytes = 64 * 1024;
  // Datagrams read with one system call at most.
  static const int kDatagramsPerRead = 8;
  // How long TerminateModule lets a running hook or action finish before its process group is
  // killed.
  static const int kStopGraceMs = 1000;

  // What the watcher knows of the kernel: every link, address and main-table IPv4 route, each as
  // the last message that told it (the kernel's own bytes).
  struct KernelState {
    std::map<int, std::string> links;                      // by interface index
    std::unordered_map<std::string, std::string> addresses;  // by AddressKey
    std::vector<std::string> order;  // keys of addresses in the kernel's order (when read whole)
    std::map<std::string, std::string> routes;  // main-table IPv4 routes, by RouteKey
  };

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
  // The polling thread's body: fills the maps, then waits for messages until TerminateModule.
  virtual int StartPolling();

  // The datagrams queued on the socket (up to kDatagramsPerRead, without waiting), dispatched
  // message by message. 0; 1 when nothing was queued; -1 when the read failed (logged). A
  // datagram cut short is not looked at, nor what came with it, and, like a failure with
  // ENOBUFS, marks the state to be read again (ResyncPending()).
  int AnalysisNetlinkMessage();
  // Whether events were lost since the state was last read whole.
  bool ResyncPending() const { return _resyncPending; }
  // Drops what is queued on the socket (older than what is read next), reads the kernel's links,
  // addresses and routes on a socket of its own and reports the differences (ReportKernelChanges).
  // 0; -1 when the state could not be read (it stays pending).
  int ResyncKernelState();
  // Reports every difference between the known state and `now` as the message that would have
  // told it: links that are new or whose link flags changed, links gone while up (as going
  // down), then removed addresses, new ones, removed main-table routes, and routes new or going
  // another way, each through the Check* operations. Then `now` is the known state. The number
  // of messages reported.
  int ReportKernelChanges(KernelState const& now);
  // Reads the kernel's links, addresses and main-table IPv4 routes with three dumps on a socket
  // of its own. 0; -1.
  static int ReadKernelState(KernelState& state);
  // Records a kernel message (link or address) in the known state.
  void NoteKernelMessage(nlmsghdr const* header);
  // The key of an address message: family, interface index, address and (IPv4) prefix length;
  // empty when it has no address.
  static std::string AddressKey(nlmsghdr const* header);
  // The key of a main-table IPv4 route message (destination, length, TOS, type, metric); empty
  // for any other route.
  static std::string RouteKey(nlmsghdr const* header);
  KernelState const& GetKnownState() const { return _known; }
  // How many times events were lost (ENOBUFS or a cut datagram) and the state read again.
  long GetLostCount() const { return _lostCount; }

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

  // Logs the maps, one line per interface, at LOG_DEBUG ("Netlink view [...]"): after the state
  // was read again and when the module stops.
  void LogView() const;
  // The name of an interface index: from the links the kernel reported, else if_indextoname.
  std::string NameOfIndex(int index) const;
  void RebuildIndexNames();
  // The receive buffers, each of slotBytes at least.
  void EnsureRecvArea(std::size_t slotBytes);
  // The messages of one datagram, each to its check (and, from the kernel, to the known state).
  void HandleDatagram(char* data, ssize_t received, bool fromKernel);
  // Kills the process groups of the children the polling thread waits for (a hook, an action).
  void KillPollingThreadChildren() const;

  int _netlinkFd;
  pthread_t _pollingThread;
  IFMap<std::string> _ipv4Map;
  std::map<std::string, std::vector<std::string> > _ipv6Map;
  IFMap<bool> _linkMap;
  bool _threadStarted;  // _pollingThread holds a thread that was not joined yet
  int _wakeFd;          // eventfd that wakes the polling thread for a stop
  std::atomic<bool> _stopRequested;
  std::atomic<bool> _threadEnded;
  std::atomic<pid_t> _pollingTid;
  std::unique_ptr<char[]> _recvArea;  // kDatagramsPerRead buffers of _slotBytes each
  std::size_t _slotBytes;
  int _lastDatagrams;  // datagrams the last AnalysisNetlinkMessage read
  bool _resyncPending;
  long _lostCount;
  KernelState _known;
  std::unordered_map<int, std::string> _indexNames;  // from _known.links
};

}  // namespace module
}  // namespace network
}  // namespace vornnetwork

#endif
