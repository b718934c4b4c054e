// The pieces the IPv6 scenarios share: the daemon, the peer routers, waiting for what the
// daemon does.
#ifndef VORN_TESTS_E2E_IPV6_SUPPORT_H
#define VORN_TESTS_E2E_IPV6_SUPPORT_H

#include <json/json.h>
#include <unistd.h>

#include <cstdlib>
#include <functional>
#include <regex>
#include <string>
#include <vector>

#include "support/test_util.h"
#include "vornwireless/dbus_net/net_client.h"

namespace ipv6e2e {

inline std::string PeerPid(const std::string& ifname) {
  const char* p = std::getenv(("VORN_PEER_" + ifname + "_PID").c_str());
  return p ? p : "";
}

// Runs argv in the network namespace of the peer host of ifname.
inline vorntest::RunResult InPeer(const std::string& ifname, std::vector<std::string> argv,
                                  int timeoutSec = 120) {
  argv.insert(argv.begin(), {"/usr/bin/nsenter", "-t", PeerPid(ifname), "-n"});
  return vorntest::Run(argv, "", timeoutSec);
}

inline std::string Sender() { return vorntest::SourceDir() + "/tests/e2e/ipv6/ra-sender"; }

// Polls cond every 50 ms for up to seconds; its last value.
inline bool WaitFor(const std::function<bool()>& cond, int seconds = 20) {
  for (int i = 0; i < seconds * 20; ++i) {
    if (cond()) return true;
    usleep(50000);
  }
  return cond();
}

// The first link-local address of ifname (ours, or the peer's), once neither side is tentative.
inline std::string LinkLocal(const std::string& ifname, bool peer) {
  std::regex re("inet6 (fe80::[0-9a-f:]+)/64");
  std::string found;
  WaitFor([&]() {
    vorntest::RunResult r = peer ? vorntest::PeerIp(ifname, {"-6", "addr", "show", "dev", ifname})
                                 : vorntest::Ip({"-6", "addr", "show", "dev", ifname});
    std::smatch m;
    if (r.out.find("tentative") != std::string::npos || !std::regex_search(r.out, m, re)) {
      return false;
    }
    found = m[1];
    return true;
  });
  return found;
}

// "ifname=gateway" of each entry of the IPv6 gateway list, in order.
inline std::string V6Gateways() {
  vornnetwork::dbus::NetClient client;
  Json::Value request, result;
  request["type"] = "GTYPE_V6";
  if (client.GetGatewayListData(request, result) < 0) return "error";
  std::string out;
  for (Json::Value const& e : result) {
    out += (out.empty() ? "" : " ") + e["ifname"].asString() + "=" + e["gateway"].asString();
  }
  return out;
}

inline std::string DefaultRoute6() {
  return vorntest::Ip({"-6", "route", "show", "default"}).out;
}

}  // namespace ipv6e2e

#endif
