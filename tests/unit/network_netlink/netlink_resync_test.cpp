// The link watcher when events are lost: a datagram cut short (MSG_TRUNC) and a socket that
// overflowed (ENOBUFS), both made real with the sandbox's kernel; the report of only what changed
// between the state the watcher knew and the one it reads again; and its stop while a hook runs.
#include "vornwireless/network/netlink/netlink_module.h"

#include <gtest/gtest.h>
#include <signal.h>
#include <stdlib.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstring>
#include <set>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "unit/hook/hook_recorder.h"
#include "unit/network_netlink/netlink_test_support.h"

using vornnetwork::network::module::NetlinkModule;
using vorntest::AddrMessage;
using vorntest::HookRun;
using vorntest::LinkMessage;
using vorntest::LogLine;
using vorntest::RouteMessage;

namespace {

using namespace vorntest::netlink_constants;

void IpBatch(const std::string& commands) {
  auto r = vorntest::Run({"/usr/sbin/ip", "-batch", "-"}, commands);
  ASSERT_EQ(r.status, 0) << r.err;
}

std::vector<HookRun> Runs(const std::string& hook) {
  std::vector<HookRun> out;
  for (const HookRun& r : vorntest::HookRuns()) {
    if (r.program.find("/" + hook + "/") != std::string::npos) out.push_back(r);
  }
  return out;
}

// The kernel's addresses of ifname of one family ("-4" or "-6"), as `ip` prints them.
std::set<std::string> KernelAddresses(const std::string& family, const std::string& ifname) {
  auto r = vorntest::Run({"/usr/sbin/ip", "-o", family, "addr", "show", "dev", ifname});
  std::set<std::string> out;
  std::istringstream lines(r.out);
  std::string line;
  while (std::getline(lines, line)) {
    std::istringstream words(line);
    std::string word;
    while (words >> word) {
      if (word == "inet" || word == "inet6") {
        words >> word;
        out.insert(word.substr(0, word.find('/')));
        break;
      }
    }
  }
  return out;
}

// Pads a message to at least `size` bytes with attributes the watcher does not look at.
void NlMessageBlob(std::string& message, std::size_t size) {
  while (message.size() < size) {
    const std::size_t chunk = std::min<std::size_t>(60000, (size - message.size() + 7) & ~3u);
    rtattr a;
    a.rta_type = IFLA_UNSPEC;
    a.rta_len = static_cast<unsigned short>(chunk);
    message.append(reinterpret_cast<char const*>(&a), sizeof a);
    message.append(chunk - sizeof a, '\0');
  }
  const uint32_t len = static_cast<uint32_t>(message.size());
  std::memcpy(&message[0], &len, sizeof len);
}

// A message of a link with its index (as the kernel's dump would give it).
std::string Link(const std::string& name, int index, unsigned int flags) {
  return LinkMessage(name, flags, RTM_NEWLINK, index).Bytes();
}

class NetlinkResyncTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    vorntest::Run({"/bin/rm", "-rf", kScripts, "/usr/vorn/libexec/platform"});
    vorntest::RemoveHooks();
    vorntest::ClearHookRuns();
    vorntest::ClearLinkEvents();
    ASSERT_TRUE(vorntest::InstallRecordingHook("net/ipv4_change", "10-record"));
    ASSERT_TRUE(vorntest::InstallRecordingHook("net/ipv6_change", "10-record"));
    ASSERT_TRUE(vorntest::InstallRecordingHook("net/gateway_change", "10-record"));
    ASSERT_TRUE(vorntest::InstallLinkRecorders());
    eth0 = static_cast<int>(if_nametoindex("eth0"));
    ASSERT_GT(eth0, 0);
  }
  void TearDown() override {
    module.Terminate();
    unsetenv("VORN_NETLINK_RCVBUF");
  }
  // Makes the module know the kernel's present state (its report is then forgotten).
  void Seed() {
    NetlinkModule::KernelState now;
    ASSERT_EQ(NetlinkModule::ReadKernelState(now), 0);
    module.ReportKernelChanges(now);
    vorntest::ClearHookRuns();
    vorntest::ClearLinkEvents();
  }
  NetlinkModule module;
  int eth0 = 0;
};

// --- what changed -------------------------------------------------------------------------------

TEST_F(NetlinkResyncTest, TheSameStateAgainReportsNothing) {
  NetlinkModule::KernelState state;
  state.links[eth0] = Link("eth0", eth0, kUp);
  const std::string a = AddrMessage(RTM_NEWADDR, AF_INET6, "eth0", "fd00:1::1", 64).Bytes();
  state.addresses[NetlinkModule::AddressKey(reinterpret_cast<nlmsghdr const*>(a.data()))] = a;
  EXPECT_EQ(module.ReportKernelChanges(state), 2);  // first sight: the link and the address
  EXPECT_EQ(vorntest::LinkEvents(), std::vector<std::string>{"up eth0 flag=1"});
  EXPECT_EQ(Runs("net/ipv6_change").size(), 1u);
  vorntest::ClearHookRuns();
  vorntest::ClearLinkEvents();

  EXPECT_EQ(module.ReportKernelChanges(state), 0);
  // A flag that says nothing about the link (promiscuous) is no change either.
  state.links[eth0] = Link("eth0", eth0, kUp | IFF_PROMISC);
  EXPECT_EQ(module.ReportKernelChanges(state), 0);
  EXPECT_TRUE(vorntest::LinkEvents().empty());
  EXPECT_TRUE(vorntest::HookRuns().empty());
}

TEST_F(NetlinkResyncTest, OnlyRealChangesAreReportedAsTheirMessagesWouldBe) {
  auto key = [](std::string const& m) {
    return NetlinkModule::AddressKey(reinterpret_cast<nlmsghdr const*>(m.data()));
  };
  const std::string v6a = AddrMessage(RTM_NEWADDR, AF_INET6, "eth0", "fd00:1::a", 64).Bytes();
  const std::string v6b = AddrMessage(RTM_NEWADDR, AF_INET6, "eth0", "fd00:1::b", 64).Bytes();
  const std::string v6c = AddrMessage(RTM_NEWADDR, AF_INET6, "eth0", "fd00:1::c", 64).Bytes();
  const std::string v4a = AddrMessage(RTM_NEWADDR, AF_INET, "eth0", "10.1.0.1", 24, "eth0").Bytes();
  const std::string v4b = AddrMessage(RTM_NEWADDR, AF_INET, "eth0", "10.1.0.2", 24, "eth0").Bytes();
  NetlinkModule::KernelState before;
  before.links[eth0] = Link("eth0", eth0, kUp);
  before.links[900] = Link("gone0", 900, kUp);
  before.links[901] = Link("gone1", 901, IFF_UP);  // went away down: nothing to tell
  for (auto const* m : {&v6a, &v6b, &v4a}) {
    before.addresses[key(*m)] = *m;
    before.order.push_back(key(*m));
  }
  auto routeKey = [](std::string const& m) {
    return NetlinkModule::RouteKey(reinterpret_cast<nlmsghdr const*>(m.data()));
  };
  const std::string r5 = RouteMessage(RTM_NEWROUTE, 254, "eth0", "10.5.0.0", 16, "10.200.1.1").Bytes();
  const std::string r6 = RouteMessage(RTM_NEWROUTE, 254, "eth0", "10.6.0.0", 16, "10.200.1.1").Bytes();
  const std::string r6b = RouteMessage(RTM_NEWROUTE, 254, "eth0", "10.6.0.0", 16, "10.200.1.7").Bytes();
  const std::string r7 = RouteMessage(RTM_NEWROUTE, 254, "eth0", "10.7.0.0", 16, "").Bytes();
  const std::string r8 = RouteMessage(RTM_NEWROUTE, 254, "eth0", "10.8.0.0", 16, "").Bytes();
  EXPECT_TRUE(NetlinkModule::RouteKey(reinterpret_cast<nlmsghdr const*>(
                  RouteMessage(RTM_NEWROUTE, 100, "eth0", "10.8.0.0", 16, "").Bytes().data()))
                  .empty());  // other tables are not watched
  for (auto const* m : {&r5, &r6, &r8}) before.routes[routeKey(*m)] = *m;
  module.ReportKernelChanges(before);
  EXPECT_EQ(module.GetIPv6Map().at("eth0"), (std::vector<std::string>{"fd00:1::a", "fd00:1::b"}));
  vorntest::ClearHookRuns();
  vorntest::ClearLinkEvents();

  // Meanwhile: eth0 lost its carrier, gone0 and gone1 went away, fd00:1::a went, fd00:1::c came
  // and the IPv4 address changed.
  NetlinkModule::KernelState after;
  after.links[eth0] = Link("eth0", eth0, IFF_UP);
  for (auto const* m : {&v6b, &v6c, &v4b}) {
    after.addresses[key(*m)] = *m;
    after.order.push_back(key(*m));
  }
  // 10.5.0.0/16 went, 10.6.0.0/16 goes through another gateway, 10.7.0.0/16 came, 10.8.0.0/16
  // stayed.
  for (auto const* m : {&r6b, &r7, &r8}) after.routes[routeKey(*m)] = *m;
  // eth0's link, gone0 down, fd00:1::a and 10.1.0.1 removed, fd00:1::c and 10.1.0.2 added, three
  // routes.
  EXPECT_EQ(module.ReportKernelChanges(after), 9);
  EXPECT_EQ(vorntest::LinkEvents(),
            (std::vector<std::string>{"down eth0 flag=1", "down gone0 flag=1"}));
  // An IPv6 removal runs no hook; the new one sees the list without the removed address.
  auto v6 = Runs("net/ipv6_change");
  ASSERT_EQ(v6.size(), 1u);
  EXPECT_EQ(v6[0].env["NEW_ADDRESS"], "fd00:1::c");
  EXPECT_EQ(v6[0].env["ORIGIN_ADDRESS"], "fd00:1::b");
  EXPECT_EQ(v6[0].env["PREFIX_LENGTH"], "64");
  EXPECT_EQ(module.GetIPv6Map().at("eth0"), (std::vector<std::string>{"fd00:1::b", "fd00:1::c"}));
  // An IPv4 removal of the stored address is silent, as its message would be; the new address
  // is reported from the old one.
  auto v4 = Runs("net/ipv4_change");
  ASSERT_EQ(v4.size(), 1u);
  EXPECT_EQ(v4[0].env["ORIGIN_ADDRESS"], "10.1.0.1");
  EXPECT_EQ(v4[0].env["NEW_ADDRESS"], "10.1.0.2");
  EXPECT_EQ(module.GetIPv4Map().Get("eth0"), "10.1.0.2");
  EXPECT_FALSE(module.GetLinkMap().Get("gone0"));
  auto routes = Runs("net/gateway_change");
  ASSERT_EQ(routes.size(), 3u);
  EXPECT_EQ(routes[0].env["ACTION"], "DEL");
  EXPECT_EQ(routes[0].env["DESTINATION"], "10.5.0.0");
  EXPECT_EQ(routes[0].env["GATEWAY"], "10.200.1.1");
  EXPECT_EQ(routes[1].env["ACTION"], "NEW");
  EXPECT_EQ(routes[1].env["DESTINATION"], "10.6.0.0");
  EXPECT_EQ(routes[1].env["GATEWAY"], "10.200.1.7");
  EXPECT_EQ(routes[2].env["ACTION"], "NEW");
  EXPECT_EQ(routes[2].env["DESTINATION"], "10.7.0.0");
  EXPECT_EQ(routes[2].env["GATEWAY"], "0.0.0.0");
  EXPECT_EQ(routes[2].env["IFNAME"], "eth0");

  // The state reported is the one known now.
  vorntest::ClearHookRuns();
  vorntest::ClearLinkEvents();
  EXPECT_EQ(module.ReportKernelChanges(after), 0);
  EXPECT_TRUE(vorntest::HookRuns().empty());
  EXPECT_TRUE(vorntest::LinkEvents().empty());
}

TEST_F(NetlinkResyncTest, ChangesOfNamesTheWatcherDropsStayDropped) {
  NetlinkModule::KernelState state;
  state.links[910] = Link("tap0", 910, kUp);
  state.links[911] = Link("eth5", 911, kUp | IFF_SLAVE);
  const std::string m =
      AddrMessage(RTM_NEWADDR, AF_INET, "eth0", "10.3.0.1", 24, "docker0").Bytes();
  state.addresses[NetlinkModule::AddressKey(reinterpret_cast<nlmsghdr const*>(m.data()))] = m;
  module.ReportKernelChanges(state);
  EXPECT_TRUE(vorntest::LinkEvents().empty());
  EXPECT_TRUE(vorntest::HookRuns().empty());
  EXPECT_TRUE(module.GetLinkMap().Get("tap0"));  // recorded, not reported
  EXPECT_TRUE(module.GetLinkMap().Get("eth5"));
}

// --- the kernel ---------------------------------------------------------------------------------

TEST_F(NetlinkResyncTest, CutDatagramDropsWhatIsQueuedAndReportsTheKernelsChange) {
  ASSERT_EQ(module.Initialize(), 0);
  Seed();
  const int fd = module.GetNetlinkFd();
  // A datagram larger than the receive buffer, then a real change queued behind it.
  std::string big = LinkMessage("big0", kUp).Bytes();
  NlMessageBlob(big, NetlinkModule::kRecvBufferBytes + 4096);
  ASSERT_TRUE(vorntest::SendToSocket(fd, big));
  vorntest::IpOk({"addr", "add", "10.200.1.44/24", "dev", "eth0"});
  vorntest::SyslogCapture log;
  EXPECT_EQ(module.AnalysisNetlinkMessage(), 0);
  EXPECT_TRUE(module.ResyncPending());
  EXPECT_TRUE(log.HasOnce(LOG_WARNING,
                          LogLine(kFile, "Netlink datagram of [" + std::to_string(big.size()) +
                                             "] bytes cut to [65536] (MSG_TRUNC), reading the "
                                             "link and address state again")))
      << log.Dump();
  EXPECT_TRUE(vorntest::LinkEvents().empty());  // the cut datagram is not looked at
  EXPECT_TRUE(Runs("net/ipv4_change").empty());

  ASSERT_EQ(module.ResyncKernelState(), 0);
  EXPECT_FALSE(module.ResyncPending());
  EXPECT_EQ(module.GetLostCount(), 1);
  // The queued message was dropped unread; the change it told came from the state read again.
  auto v4 = Runs("net/ipv4_change");
  ASSERT_EQ(v4.size(), 1u);
  EXPECT_EQ(v4[0].env["IFNAME"], "eth0");
  EXPECT_EQ(v4[0].env["NEW_ADDRESS"], "10.200.1.44");
  EXPECT_EQ(module.GetIPv4Map().Get("eth0"), "10.200.1.44");
  EXPECT_TRUE(vorntest::LinkEvents().empty());
  EXPECT_EQ(module.AnalysisNetlinkMessage(), 1);  // nothing left queued

  // The buffer grew: the same datagram now fits.
  log.Clear();
  ASSERT_TRUE(vorntest::SendToSocket(fd, big));
  EXPECT_EQ(module.AnalysisNetlinkMessage(), 0);
  EXPECT_FALSE(module.ResyncPending());
  EXPECT_TRUE(log.Matching("MSG_TRUNC").empty()) << log.Dump();
  EXPECT_EQ(vorntest::LinkEvents(), std::vector<std::string>{"up big0 flag=1"});
  vorntest::IpOk({"addr", "del", "10.200.1.44/24", "dev", "eth0"});
}

TEST_F(NetlinkResyncTest, OverflowIsDetectedAndTheStateReadAgainEqualsTheKernels) {
  // The smallest buffer the kernel grants: a few messages.
  setenv("VORN_NETLINK_RCVBUF", "1", 1);
  vorntest::SyslogCapture log;
  ASSERT_EQ(module.Initialize(), 0);
  Seed();
  std::string add;
  for (int i = 1; i <= 60; ++i) {
    add += "address add 2001:db8:7::" + std::to_string(i) + "/128 dev eth0 nodad\n";
    add += "address add 10.7.0." + std::to_string(i) + "/32 dev eth0\n";
    if (i <= 20) add += "route add 10.8." + std::to_string(i) + ".0/24 dev eth0\n";
  }
  IpBatch(add);
  // Read until the overflow shows (the kernel keeps a few messages and drops the rest).
  int result = 0;
  for (int i = 0; i < 1000 && result != -1; ++i) result = module.AnalysisNetlinkMessage();
  ASSERT_EQ(result, -1);
  EXPECT_TRUE(module.ResyncPending());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "recvmsg ret: [-1] from fd [" +
                                                      std::to_string(module.GetNetlinkFd()) +
                                                      "].")))
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_WARNING, LogLine(kFile,
                                               "Netlink events lost (ENOBUFS), reading the link "
                                               "and address state again")))
      << log.Dump();
  const std::size_t reportedBefore = Runs("net/ipv6_change").size();
  ASSERT_EQ(module.ResyncKernelState(), 0);

  // Every address is in the view exactly once, and each was reported once: by its message or
  // by the state read again, never by both.
  const std::set<std::string> kernel6 = KernelAddresses("-6", "eth0");
  ASSERT_EQ(module.GetIPv6Map().count("eth0"), 1u);
  const std::vector<std::string>& view6 = module.GetIPv6Map().at("eth0");
  EXPECT_EQ(std::set<std::string>(view6.begin(), view6.end()), kernel6);
  EXPECT_EQ(view6.size(), kernel6.size());
  std::multiset<std::string> reported;
  for (auto& r : Runs("net/ipv6_change")) reported.insert(r.env["NEW_ADDRESS"]);
  EXPECT_GT(reported.size(), reportedBefore);
  for (int i = 1; i <= 60; ++i) {
    EXPECT_EQ(reported.count("2001:db8:7::" + std::to_string(i)), 1u) << i;
  }
  EXPECT_EQ(KernelAddresses("-4", "eth0").count(module.GetIPv4Map().Get("eth0")), 1u)
      << module.GetIPv4Map().Get("eth0");
  // Each new main-table route reported once too.
  std::multiset<std::string> routes;
  for (auto& r : Runs("net/gateway_change")) {
    if (r.env["ACTION"] == "NEW") routes.insert(r.env["DESTINATION"]);
  }
  for (int i = 1; i <= 20; ++i) {
    EXPECT_EQ(routes.count("10.8." + std::to_string(i) + ".0"), 1u) << i;
  }

  // Removals lost the same way leave the view equal to the kernel's again.
  std::string del;
  for (int i = 1; i <= 50; ++i) {
    del += "address del 2001:db8:7::" + std::to_string(i) + "/128 dev eth0\n";
  }
  IpBatch(del);
  result = 0;
  for (int i = 0; i < 1000 && result != -1; ++i) result = module.AnalysisNetlinkMessage();
  ASSERT_EQ(result, -1);
  ASSERT_EQ(module.ResyncKernelState(), 0);
  const std::vector<std::string>& after = module.GetIPv6Map().at("eth0");
  EXPECT_EQ(std::set<std::string>(after.begin(), after.end()), KernelAddresses("-6", "eth0"));
  EXPECT_EQ(module.GetLostCount(), 2);

  std::string cleanup;
  for (int i = 1; i <= 20; ++i) cleanup += "route del 10.8." + std::to_string(i) + ".0/24 dev eth0\n";
  for (int i = 1; i <= 60; ++i) {
    cleanup += "address del 10.7.0." + std::to_string(i) + "/32 dev eth0\n";
    if (i > 50) cleanup += "address del 2001:db8:7::" + std::to_string(i) + "/128 dev eth0\n";
  }
  IpBatch(cleanup);
}

// --- the stop -----------------------------------------------------------------------------------

TEST_F(NetlinkResyncTest, TerminateKillsAHookThatDoesNotEndAfterItsGrace) {
  const std::string record = "/run/hanging-hook.txt";
  vorntest::RemoveHooks();
  ASSERT_EQ(vorntest::Run({"/bin/mkdir", "-p", "/usr/vorn/etc/hooks/net/ipv4_change"}).status, 0);
  // The hook and a child of its own: both must be gone after the stop.
  ASSERT_TRUE(vorntest::WriteFile("/usr/vorn/etc/hooks/net/ipv4_change/10-hang",
                                  "#!/bin/sh\nsleep 1000 &\necho \"$$ $!\" > " + record +
                                      "\nwait\necho end >> " + record + "\n",
                                  0755));
  ASSERT_EQ(module.Initialize(), 0);
  ASSERT_EQ(module.Start(), 0);
  ASSERT_TRUE(vorntest::SendToSocket(
      module.GetNetlinkFd(),
      AddrMessage(RTM_NEWADDR, AF_INET, "eth0", "10.200.1.35", 24).Bytes()));
  pid_t hook = 0;
  pid_t child = 0;
  ASSERT_TRUE(vorntest::WaitFor([&] {
    std::istringstream in(vorntest::ReadFile(record));
    return static_cast<bool>(in >> hook >> child);
  }));
  vorntest::SyslogCapture log;
  const auto start = std::chrono::steady_clock::now();
  EXPECT_EQ(module.Terminate(), 0);
  const double took =
      std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
  std::printf("Terminate with a hanging hook took %.3f s\n", took);
  EXPECT_TRUE(log.HasOnce(LOG_WARNING,
                          LogLine(kFile, "netlink thread still runs a program at stop: killing it")))
      << log.Dump();
  EXPECT_TRUE(log.Matching("netlink thread is not cancelled|did not stop").empty()) << log.Dump();
  EXPECT_EQ(module.GetNetlinkFd(), -1);
  // The hook never finished, and neither it nor its child outlives the stop (the sandbox's init
  // reaps the orphaned child).
  EXPECT_EQ(vorntest::ReadFile(record).find("end"), std::string::npos);
  EXPECT_TRUE(vorntest::WaitFor([&] { return kill(hook, 0) != 0 && kill(child, 0) != 0; }))
      << hook << " " << child;
}

TEST_F(NetlinkResyncTest, TerminateLetsAHookEndingWithinTheGraceFinish) {
  const std::string record = "/run/ending-hook.txt";
  const std::string go = "/run/ending-hook.go";
  vorntest::RemoveHooks();
  ASSERT_EQ(vorntest::Run({"/bin/mkdir", "-p", "/usr/vorn/etc/hooks/net/ipv4_change"}).status, 0);
  ASSERT_TRUE(vorntest::WriteFile(
      "/usr/vorn/etc/hooks/net/ipv4_change/10-ending",
      "#!/bin/sh\necho begin >> " + record + "\nwhile [ ! -e " + go +
          " ]; do sleep 0.01; done\necho end >> " + record + "\n",
      0755));
  ASSERT_EQ(module.Initialize(), 0);
  ASSERT_EQ(module.Start(), 0);
  ASSERT_TRUE(vorntest::SendToSocket(
      module.GetNetlinkFd(),
      AddrMessage(RTM_NEWADDR, AF_INET, "eth0", "10.200.1.36", 24).Bytes()));
  ASSERT_TRUE(vorntest::WaitFor([&] { return vorntest::ReadFile(record) == "begin\n"; }));
  vorntest::SyslogCapture log;
  // The hook may end as soon as the stop has begun.
  std::thread release([&] {
    std::this_thread::sleep_for(std::chrono::milliseconds(20));
    vorntest::WriteFile(go, "");
  });
  EXPECT_EQ(module.Terminate(), 0);
  release.join();
  EXPECT_EQ(vorntest::ReadFile(record), "begin\nend\n");
  EXPECT_TRUE(log.Matching("killing it|netlink thread").empty()) << log.Dump();
  EXPECT_EQ(module.GetIPv4Map().Get("eth0"), "10.200.1.36");
  unlink(go.c_str());
}

}  // namespace
