// The router advertisement watch: one raw ICMPv6 socket, filtered to Router Solicitations and
// Advertisements, and one thread that learns each interface's IPv6 gateway from the RAs, hands
// it to the route module and sets the interface's address mode from the RA's flags. It keeps the
// gateway it has: another router wins only when the old one no longer answers or has been
// silent for more than 900 seconds.
#ifndef VORNWIRELESS_NETWORK_IPV6_IPV6_MODULE_H
#define VORNWIRELESS_NETWORK_IPV6_IPV6_MODULE_H

#include <netinet/in.h>
#include <pthread.h>

#include <atomic>
#include <ctime>
#include <map>
#include <mutex>
#include <string>
#include <vector>

#include "vornwireless/network/base_module.h"

namespace vornnetwork {
namespace network {
namespace module {

// What the watch knows of one interface.
struct InterfaceContext {
  std::string gateway;  // source address of the accepted RA; "" for none
  time_t lastRaTime;    // when the accepted gateway last advertised
  int state;            // RA_STATE_..., 0 when nothing has been decided

  InterfaceContext() : lastRaTime(0), state(0) {}
  InterfaceContext(std::string const& gw, time_t t, int s) : gateway(gw), lastRaTime(t), state(s) {}
};

enum RA_STATE {
  RA_STATE_NONE = 0,
  RA_STATE_MANAGED = 1,          // M set: address by DHCPv6
  RA_STATE_STATELESS = 2,        // M and O clear
  RA_STATE_STATELESS_OTHER = 3,  // M clear, O set
};

class IPv6Module : public BaseModule {
 public:
  // Size of the RA header ahead of the options, and of a datagram buffer.
  static const int kRaHeaderLength = 16;
  static const int kPacketBufferSize = 1500;
  // A router silent for longer than this may be replaced.
  static constexpr double kRaExchangeSeconds = 900.0;

  IPv6Module();
  ~IPv6Module() override;

  static BaseModule* Create();

  // "RESET_IPV6_MODULE" forgets the context of request["ifname"]. Always 0.
  int ProcessRequest(Json::Value const& request, Json::Value& response) override;
  // Opens the ICMPv6 socket. 0; -1.
  int InitialModule() override;
  // Stops and joins the watch thread, closes the socket. 0.
  int TerminateModule() override;
  // Starts the watch thread; a thread that cannot be created is logged and still gives 0.
  int StartModule() override;

  // The socket with packet information, hop limits 255 and the filter of types 133 and 134.
  // False (socket closed) when a step failed.
  static bool open_icmpv6_socket(int& fd);
  // One datagram into buffer (kPacketBufferSize bytes) with its sender and packet information
  // (pointing into the process-wide control buffer). The byte count; 0; -1 on failure.
  // Also returns -1 without a log when wakeFd became readable (the module is stopping).
  static int recv_rs_ra(int fd, int wakeFd, unsigned char* buffer, sockaddr_in6* sender,
                        in6_pktinfo** info);
  // The address as text into text (INET6_ADDRSTRLEN bytes). 0; -1.
  static int print_addr(in6_addr* address, char* text);

  // One received datagram: checks it and hands an RA to ProcessRA.
  void HandlePacket(unsigned char const* packet, int length, sockaddr_in6 const& sender,
                    std::string const& ifname);
  // Whether the interface takes RAs.
  virtual bool Ipv6Enable(std::string const& ifname);
  bool IsRaStateChange(std::string const& ifname, bool managed, bool other);
  // Whether the context's gateway answers a neighbour solicitation (ndisc6).
  virtual bool IsGatewayReachable(std::string const& ifname);
  // Whether the context's gateway has been silent for more than 900 seconds.
  bool IsRaExchangeable(std::string const& ifname);
  // The autonomous prefixes of the RA's prefix options, as text.
  static std::vector<std::string> RaAutoPrefixGet(unsigned char const* ra, int length,
                                                  char const* ifname);
  bool IsRaValid(unsigned char const* ra, int length, std::string const& ifname, bool managed);
  void ProcessRA(std::string const& gateway, std::string const& ifname, unsigned char const* ra,
                 int length, bool managed, bool other);

  // A copy of one interface's context (a default one when there is none) and whether it exists.
  InterfaceContext GetContext(std::string const& ifname, bool* exists = nullptr) const;
  int GetSocket() const { return _icmpv6Socket; }

 protected:
  // The clock of the 900-second rule and of the contexts.
  virtual time_t Now() const { return time(nullptr); }

 private:
  static void* WatchThread(void* arg);
  void Watch();

  int _icmpv6Socket;
  std::map<std::string, InterfaceContext> _contexts;
  // Guards _contexts between the watch thread and ResetIPv6Module.
  mutable std::recursive_mutex _contextMutex;
  pthread_t _thread;
  bool _threadStarted;
  std::atomic<bool> _stopping;
  int _wakePipe[2];  // written by TerminateModule to end the watch thread's select
};

}  // namespace module
}  // namespace network
}  // namespace vornnetwork

#endif
