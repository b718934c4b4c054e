// The link watcher fed with messages built in the test: states the kernel here cannot produce
// (running without lower-up, bond slaves, OVS bonds, foreign route tables) and malformed input.
// The operations are called directly on a module whose thread is not running.
#include "vornwireless/network/netlink/netlink_module.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>

#include <random>
#include <string>
#include <vector>

#include "fixtures/fake_journal.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "unit/hook/hook_recorder.h"
#include "unit/network_netlink/netlink_test_support.h"
#include "vornplatform/err.h"

using vornnetwork::network::module::BaseModule;
using vornnetwork::network::module::IFMap;
using vornnetwork::network::module::NetlinkModule;
using vorntest::AddrMessage;
using vorntest::LinkMessage;
using vorntest::LogLine;
using vorntest::RouteMessage;

namespace {

using namespace vorntest::netlink_constants;

const unsigned int kDown = IFF_UP;  // administratively up, no carrier

void Ifcfg(const std::string& ifname, const std::string& content) {
  ASSERT_EQ(vorntest::Run({"/bin/mkdir", "-p", kScripts}).status, 0);
  ASSERT_TRUE(vorntest::WriteFile(std::string(kScripts) + "/ifcfg-" + ifname, content));
}

// A veth pair inside our namespace; its carrier follows the peer end.
void AddPair(const std::string& name) {
  vorntest::Run({"/usr/sbin/ip", "link", "del", name});
  vorntest::IpOk({"link", "add", name, "type", "veth", "peer", "name", name + "p"});
  vorntest::IpOk({"link", "set", name, "up"});
}

void SetCarrier(const std::string& name, bool on) {
  vorntest::IpOk({"link", "set", name + "p", on ? "up" : "down"});
  const std::string want = on ? "1\n" : "0\n";
  ASSERT_TRUE(vorntest::WaitFor(
      [&] { return vorntest::ReadFile("/sys/class/net/" + name + "/carrier") == want; }));
}

class NetlinkModuleTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    vorntest::Run({"/bin/rm", "-rf", kScripts, "/usr/vorn/libexec/platform"});
    vorntest::Run({"/bin/sh", "-c", "rm -f /tmp/ovs_bond_hook_flag_*"});
    vorntest::RemoveHooks();
    vorntest::ClearHookRuns();
    vorntest::ClearLinkEvents();
    ASSERT_TRUE(vorntest::InstallRecordingHook("net/ipv4_change", "10-record"));
    ASSERT_TRUE(vorntest::InstallRecordingHook("net/ipv6_change", "10-record"));
    ASSERT_TRUE(vorntest::InstallRecordingHook("net/gateway_change", "10-record"));
    ASSERT_TRUE(vorntest::InstallLinkRecorders());
    ASSERT_TRUE(vorntest::ClearFakeJournal());
  }
  void TearDown() override {
    for (const char* name : {"s1", "s2", "docker0"}) {
      vorntest::Run({"/usr/sbin/ip", "link", "del", name});
    }
    vorntest::Run({"/usr/sbin/ip", "link", "del", "br9"});
  }
  NetlinkModule module;
};

// --- the map template --------------------------------------------------------------------------

TEST(IFMapTest, DefaultValueAndOverwrite) {
  IFMap<std::string> map("none");
  EXPECT_EQ(map.Get("eth0"), "none");
  EXPECT_FALSE(map.Has("eth0"));
  map.Set("eth0", "10.0.0.1");
  map.Set("eth1", "10.0.0.2");
  EXPECT_EQ(map.Get("eth0"), "10.0.0.1");
  map.Set("eth0", "10.0.0.3");
  EXPECT_EQ(map.Get("eth0"), "10.0.0.3");
  EXPECT_EQ(map.Size(), 2u);
  EXPECT_EQ(map.Map().begin()->first, "eth0");  // ordered by name
  EXPECT_EQ(map.Default(), "none");
  IFMap<bool> links(false);
  links.Set("eth0", true);
  links.Set("eth0", true);
  EXPECT_TRUE(links.Get("eth0"));
  EXPECT_FALSE(links.Get("eth9"));
}

TEST(NetlinkModuleBasics, TypeCreateAndSocket) {
  BaseModule* created = NetlinkModule::Create();
  ASSERT_NE(created, nullptr);
  EXPECT_EQ(created->GetType(), 5);
  EXPECT_EQ(created->ToStr(), "module:5");
  Json::Value request, response;
  EXPECT_EQ(created->ProcessRequest(request, response), 0);  // answers no requests
  EXPECT_TRUE(response.isNull());
  NetlinkModule* module = dynamic_cast<NetlinkModule*>(created);
  ASSERT_NE(module, nullptr);
  EXPECT_EQ(module->GetNetlinkFd(), -1);
  EXPECT_EQ(created->Initialize(), 0);
  const int fd = module->GetNetlinkFd();
  ASSERT_GE(fd, 0);
  sockaddr_nl addr;
  socklen_t len = sizeof addr;
  ASSERT_EQ(getsockname(fd, reinterpret_cast<sockaddr*>(&addr), &len), 0);
  EXPECT_EQ(addr.nl_family, AF_NETLINK);
  EXPECT_EQ(addr.nl_groups, 0x151u);
  int reuse = 0;
  len = sizeof reuse;
  ASSERT_EQ(getsockopt(fd, SOL_SOCKET, SO_REUSEADDR, &reuse, &len), 0);
  EXPECT_EQ(reuse, 1);
  // A burst of thousands of changes fits: the receive buffer is far above the kernel's default
  // (the kernel reports twice what was asked).
  int rcvbuf = 0;
  len = sizeof rcvbuf;
  ASSERT_EQ(getsockopt(fd, SOL_SOCKET, SO_RCVBUF, &rcvbuf, &len), 0);
  EXPECT_EQ(rcvbuf, 2 * 4 * 1024 * 1024);
  vorntest::SyslogCapture log;
  EXPECT_EQ(created->Terminate(), 0);  // never started: nothing to cancel, nothing logged
  EXPECT_EQ(module->GetNetlinkFd(), -1);
  EXPECT_EQ(log.Matching("netlink").size(), 0u) << log.Dump();
  EXPECT_EQ(created->GetState(), 1);
  delete created;
}

TEST(NetlinkModuleBasics, SocketFailureFailsTheInitialisation) {
  NetlinkModule module;
  struct rlimit saved;
  ASSERT_EQ(getrlimit(RLIMIT_NOFILE, &saved), 0);
  // No descriptor left for the socket.
  vorntest::SyslogCapture log;
  syslog(LOG_DEBUG, "socket failure test");  // the log connection is open before the limit
  int lowestFree = 0;
  while (fcntl(lowestFree, F_GETFD) != -1) ++lowestFree;
  struct rlimit tight = saved;
  tight.rlim_cur = static_cast<rlim_t>(lowestFree);
  ASSERT_EQ(setrlimit(RLIMIT_NOFILE, &tight), 0);
  const int result = module.Initialize();
  ASSERT_EQ(setrlimit(RLIMIT_NOFILE, &saved), 0);
  EXPECT_EQ(result, -1);
  EXPECT_EQ(module.GetNetlinkFd(), -1);
  EXPECT_EQ(module.GetState(), 1);
  EXPECT_EQ(log.Matching(LogLine(kFile, "NetlinkFd::Init socket(AF_NETLINK) fail.")).size(), 1u)
      << log.Dump();
  EXPECT_EQ(log.Matching("Failed to init module \\[5\\]").size(), 1u) << log.Dump();
}

// --- link messages -------------------------------------------------------------------------------

TEST_F(NetlinkModuleTest, NullAndWrongTypeAreRefused) {
  vorntest::SyslogCapture log;
  EXPECT_EQ(module.CheckNewLinkEvent(nullptr), -1);
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("eth0", kUp, RTM_DELLINK).Header()), -1);
  EXPECT_EQ(module.CheckIPChangeEvent(nullptr), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Not RTM_NEWLINK event"))) << log.Dump();
  EXPECT_EQ(log.Matching(LogLine(kFile, "Null pointer")).size(), 2u) << log.Dump();
  EXPECT_TRUE(vorntest::LinkEvents().empty());
}

TEST_F(NetlinkModuleTest, RunningWithoutLowerUpCausesNoEvent) {
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("eth0", IFF_UP | IFF_RUNNING).Header()), -1);
  EXPECT_TRUE(vorntest::LinkEvents().empty());
  EXPECT_FALSE(module.GetLinkMap().Has("eth0"));  // not even looked at
  // Lower-up without running is no passing state: it is a real "down".
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("eth0", IFF_UP | kLowerUp).Header()), 1);
  EXPECT_EQ(vorntest::LinkEvents(), std::vector<std::string>{"down eth0 flag=1"});
}

TEST_F(NetlinkModuleTest, SameStateTwiceGivesOneEvent) {
  vorntest::SyslogCapture log;
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("eth0", kUp).Header()), 0);
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("eth0", kUp).Header()), 0);
  EXPECT_EQ(vorntest::LinkEvents(), std::vector<std::string>{"up eth0 flag=1"});
  EXPECT_TRUE(log.HasOnce(LOG_DEBUG, LogLine(kFile, "Drop event by slave=[0], linkStatus=[1]")))
      << log.Dump();
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("eth0", kDown).Header()), 1);
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("eth0", kUp).Header()), 0);
  EXPECT_EQ(vorntest::LinkEvents(),
            (std::vector<std::string>{"up eth0 flag=1", "down eth0 flag=1", "up eth0 flag=1"}));
  EXPECT_FALSE(vorntest::Exists(vorntest::kLinkFlag));  // lowered after each event
}

TEST_F(NetlinkModuleTest, FirstMessageOfAnUnknownInterfaceIsAChange) {
  // "down" equals the map's default value, yet the first message is reported.
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("eth5", kDown).Header()), 1);
  EXPECT_EQ(vorntest::LinkEvents(), std::vector<std::string>{"down eth5 flag=1"});
  EXPECT_TRUE(module.GetLinkMap().Has("eth5"));
  EXPECT_FALSE(module.GetLinkMap().Get("eth5"));
}

TEST_F(NetlinkModuleTest, TapIsRecordedButNotReported) {
  vorntest::FlagWatch watch;
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("tap0", kUp).Header()), 0);
  EXPECT_TRUE(vorntest::LinkEvents().empty());
  EXPECT_TRUE(watch.Events().empty());  // not even the flag
  ASSERT_TRUE(module.GetLinkMap().Has("tap0"));
  EXPECT_TRUE(module.GetLinkMap().Get("tap0"));
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("tap0", kDown).Header()), 1);
  EXPECT_FALSE(module.GetLinkMap().Get("tap0"));
  // No IP hook either.
  EXPECT_EQ(module.CheckIPChangeEvent(
                AddrMessage(RTM_NEWADDR, AF_INET, "eth0", "10.77.0.1", 24, "tap0").Header()),
            0);
  EXPECT_TRUE(vorntest::HookRuns().empty());
  EXPECT_FALSE(module.GetIPv4Map().Has("tap0"));
}

TEST_F(NetlinkModuleTest, DockerRaisesTheFlagWithoutAnEvent) {
  vorntest::FlagWatch watch;
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("docker0", kUp).Header()), 0);
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("br-docker1", kDown).Header()), 1);
  EXPECT_TRUE(vorntest::LinkEvents().empty());
  EXPECT_EQ(watch.Events(), (std::vector<std::string>{"set", "unset", "set", "unset"}));
  EXPECT_FALSE(vorntest::Exists(vorntest::kLinkFlag));
  EXPECT_TRUE(module.GetLinkMap().Get("docker0"));
  EXPECT_EQ(module.CheckIPChangeEvent(
                AddrMessage(RTM_NEWADDR, AF_INET, "eth0", "172.17.0.1", 16, "docker0").Header()),
            0);
  EXPECT_EQ(module.CheckIPChangeEvent(
                AddrMessage(RTM_NEWADDR, AF_INET6, "eth0", "fd00::1", 64, "docker0").Header()),
            0);
  EXPECT_TRUE(vorntest::HookRuns().empty());
}

TEST_F(NetlinkModuleTest, OVSBondItselfIsNeverLookedAt) {
  Ifcfg("ovs_bond0", "SLAVE_LIST=\"s1 s2\"\n");
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("ovs_bond0", kUp).Header()), -1);
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("ovs_bond0", kDown).Header()), -1);
  EXPECT_EQ(module.HandleLinkEvent("ovs_bond7", static_cast<short>(kUp)), -1);
  EXPECT_TRUE(vorntest::LinkEvents().empty());
  EXPECT_FALSE(module.GetLinkMap().Has("ovs_bond0"));
}

TEST_F(NetlinkModuleTest, BondSlaveIsRecordedNotReported) {
  vorntest::SyslogCapture log;
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("eth3", kUp | IFF_SLAVE).Header()), 0);
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("eth3", kDown | IFF_SLAVE).Header()), 1);
  EXPECT_TRUE(vorntest::LinkEvents().empty());
  EXPECT_FALSE(module.GetLinkMap().Get("eth3"));
  EXPECT_EQ(log.Matching(LogLine(kFile, "Drop event by slave=[1], linkStatus=[0]")).size(), 2u)
      << log.Dump();
  // Once it leaves the bond, its next change is reported.
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("eth3", kUp).Header()), 0);
  EXPECT_EQ(vorntest::LinkEvents(), std::vector<std::string>{"up eth3 flag=1"});
}

TEST_F(NetlinkModuleTest, IfcfgSlaveKeyMakesASlave) {
  Ifcfg("eth4", "DEVICE=eth4\nSLAVE=yes\n");
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("eth4", kUp).Header()), 0);
  Ifcfg("eth6", "DEVICE=eth6\nSLAVE=\"yesterday\"\n");  // the first three letters count
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("eth6", kUp).Header()), 0);
  EXPECT_TRUE(vorntest::LinkEvents().empty());
  Ifcfg("eth4", "DEVICE=eth4\nSLAVE=no\n");
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("eth4", kDown).Header()), 1);
  Ifcfg("eth4", "DEVICE=eth4\nSLAVE=\n");
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("eth4", kUp).Header()), 0);
  EXPECT_EQ(vorntest::LinkEvents(),
            (std::vector<std::string>{"down eth4 flag=1", "up eth4 flag=1"}));
}

TEST_F(NetlinkModuleTest, OVSBondIsUpWithTheFirstMemberAndDownWithTheLast) {
  AddPair("s1");
  AddPair("s2");
  Ifcfg("s1", "DEVICE=s1\nMASTER=ovs_bond0\nSLAVE=yes\n");
  Ifcfg("s2", "DEVICE=s2\nMASTER=ovs_bond0\nSLAVE=yes\n");
  Ifcfg("ovs_bond0", "DEVICE=ovs_bond0\nSLAVE_LIST=\" s1  s2 \"\n");
  const char flag[] = "/tmp/ovs_bond_hook_flag_ovs_bond0";

  // First member up: the bond is reported up and the flag file made.
  SetCarrier("s1", true);
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("s1", kUp).Header()), 0);
  EXPECT_EQ(vorntest::LinkEvents(), std::vector<std::string>{"up ovs_bond0 flag=1"});
  EXPECT_TRUE(vorntest::Exists(flag));
  EXPECT_FALSE(module.GetLinkMap().Has("s1"));  // the member's own state is not recorded
  // Second member up: the flag exists, nothing is reported.
  SetCarrier("s2", true);
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("s2", kUp).Header()), 0);
  EXPECT_EQ(vorntest::LinkEvents().size(), 1u);
  // First down is silent: the other member carries the bond.
  SetCarrier("s1", false);
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("s1", kDown).Header()), 0);
  EXPECT_EQ(vorntest::LinkEvents().size(), 1u);
  EXPECT_TRUE(vorntest::Exists(flag));
  // Last down reports the bond down and removes the flag.
  SetCarrier("s2", false);
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("s2", kDown).Header()), 1);
  EXPECT_EQ(vorntest::LinkEvents(),
            (std::vector<std::string>{"up ovs_bond0 flag=1", "down ovs_bond0 flag=1"}));
  EXPECT_FALSE(vorntest::Exists(flag));
  EXPECT_FALSE(module.GetLinkMap().Get("ovs_bond0"));
}

TEST_F(NetlinkModuleTest, OVSBondDownWithoutFlagIsStillReported) {
  AddPair("s1");
  Ifcfg("s1", "DEVICE=s1\nMASTER=ovs_bond0\nSLAVE=yes\n");
  Ifcfg("ovs_bond0", "DEVICE=ovs_bond0\nSLAVE_LIST=s1\n");
  SetCarrier("s1", false);
  vorntest::SyslogCapture log;
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("s1", kDown).Header()), 1);
  EXPECT_TRUE(log.HasOnce(LOG_INFO, LogLine(kFile, "ovs_bond hook flag is not exist")))
      << log.Dump();
  EXPECT_EQ(vorntest::LinkEvents(), std::vector<std::string>{"down ovs_bond0 flag=1"});
  // A member that says "up" while no member has carrier reports the bond down again: dropped.
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("s1", kUp).Header()), 1);
  EXPECT_EQ(vorntest::LinkEvents().size(), 1u);
}

TEST_F(NetlinkModuleTest, OVSFlagFileThatCannotBeMadeReportsNothing) {
  AddPair("s1");
  Ifcfg("s1", "DEVICE=s1\nMASTER=bad/name\nSLAVE=yes\n");
  Ifcfg("bad", "SLAVE_LIST=s1\n");
  // MASTER with a slash: the platform does not take it for an OVS slave; an ordinary slave.
  SetCarrier("s1", true);
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("s1", kUp).Header()), 0);
  EXPECT_TRUE(vorntest::LinkEvents().empty());

  // A master name whose flag file cannot be created.
  Ifcfg("s1", "DEVICE=s1\nMASTER=ovs_bond9\nSLAVE=yes\n");
  Ifcfg("ovs_bond9", "SLAVE_LIST=s1\n");
  ASSERT_EQ(mkdir("/tmp/ovs_bond_hook_flag_ovs_bond9", 0755), 0);  // exists: nothing to do
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("s1", kUp).Header()), 0);
  EXPECT_TRUE(vorntest::LinkEvents().empty());
  // The last member goes down: the flag (a directory here) cannot be removed.
  SetCarrier("s1", false);
  ASSERT_TRUE(vorntest::WriteFile("/tmp/ovs_bond_hook_flag_ovs_bond9/x", "x"));
  vorntest::SyslogCapture log;
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("s1", kDown).Header()), 0);
  EXPECT_TRUE(vorntest::LinkEvents().empty());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "remove file: /tmp/ovs_bond_hook_flag_ovs_bond9 failed")))
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "clear ovs bond hook flag failed")));
  vorntest::Run({"/bin/rm", "-rf", "/tmp/ovs_bond_hook_flag_ovs_bond9"});

  // Touching the flag fails when /tmp refuses new files.
  SetCarrier("s1", true);
  {
    vorntest::ReadOnlyMount ro("/tmp");
    ASSERT_TRUE(ro.ok());
    log.Clear();
    EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("s1", kUp).Header()), 0);
    EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "create file: /tmp/ovs_bond_hook_flag_ovs_bond9 failed")))
        << log.Dump();
    EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "set ovs bond hook flag failed")));
  }
  EXPECT_TRUE(vorntest::LinkEvents().empty());
}

TEST_F(NetlinkModuleTest, OVSMasterTakesItsLinkFromItsMembers) {
  AddPair("s1");
  Ifcfg("bond7", "DEVICE=bond7\nSLAVE_LIST=s1\n");
  SetCarrier("s1", false);
  // The kernel says running, the members say no link.
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("bond7", kUp).Header()), 1);
  SetCarrier("s1", true);
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("bond7", kDown).Header()), 0);
  EXPECT_EQ(vorntest::LinkEvents(),
            (std::vector<std::string>{"down bond7 flag=1", "up bond7 flag=1"}));
}

TEST_F(NetlinkModuleTest, WalkStopsAtABadAttribute) {
  // An attribute longer than the message ends the walk before the name.
  ifinfomsg info;
  std::memset(&info, 0, sizeof info);
  info.ifi_flags = kUp;
  vorntest::NlMessage m(RTM_NEWLINK);
  m.Body(info);
  rtattr bad;
  bad.rta_type = IFLA_MTU;
  bad.rta_len = 200;
  m.Body(bad);
  m.Attr(IFLA_IFNAME, std::string("eth0"));
  EXPECT_EQ(module.CheckNewLinkEvent(m.Header()), -1);
  // A message without a name.
  vorntest::NlMessage noName(RTM_NEWLINK);
  noName.Body(info).AttrU32(IFLA_MTU, 1500);
  EXPECT_EQ(module.CheckNewLinkEvent(noName.Header()), -1);
  // A header shorter than its body.
  vorntest::NlMessage shortOne(RTM_NEWLINK);
  EXPECT_EQ(module.CheckNewLinkEvent(shortOne.Header()), -1);
  EXPECT_TRUE(vorntest::LinkEvents().empty());
}

// --- addresses -------------------------------------------------------------------------------------

TEST_F(NetlinkModuleTest, IPv4ChangeRunsTheHookOncePerNewAddress) {
  EXPECT_EQ(module.CheckIPChangeEvent(
                AddrMessage(RTM_NEWADDR, AF_INET, "eth0", "10.200.1.7", 24).Header()),
            0);
  auto runs = vorntest::HookRuns();
  ASSERT_EQ(runs.size(), 1u);
  EXPECT_EQ(runs[0].program, "/usr/vorn/etc/hooks/net/ipv4_change/10-record");
  EXPECT_EQ(runs[0].args, std::vector<std::string>{"5"});
  EXPECT_EQ(runs[0].env["IFNAME"], "eth0");
  EXPECT_EQ(runs[0].env["ORIGIN_ADDRESS"], "none");
  EXPECT_EQ(runs[0].env["NEW_ADDRESS"], "10.200.1.7");
  EXPECT_EQ(runs[0].env["PREFIX_LENGTH"], "-1");
  EXPECT_EQ(runs[0].env["IS_LINK"], "true");
  // The same address again: nothing.
  EXPECT_EQ(module.CheckIPChangeEvent(
                AddrMessage(RTM_NEWADDR, AF_INET, "eth0", "10.200.1.7", 24).Header()),
            0);
  EXPECT_EQ(vorntest::HookRuns().size(), 1u);
  // Deleting it is silent and keeps it stored, so that adding it back is silent too.
  EXPECT_EQ(module.CheckIPChangeEvent(
                AddrMessage(RTM_DELADDR, AF_INET, "eth0", "10.200.1.7", 24).Header()),
            0);
  EXPECT_EQ(module.GetIPv4Map().Get("eth0"), "10.200.1.7");
  EXPECT_EQ(module.CheckIPChangeEvent(
                AddrMessage(RTM_NEWADDR, AF_INET, "eth0", "10.200.1.7", 24).Header()),
            0);
  EXPECT_EQ(vorntest::HookRuns().size(), 1u);
  // A delete of another address counts as a change (isNew is not looked at).
  EXPECT_EQ(module.CheckIPChangeEvent(
                AddrMessage(RTM_DELADDR, AF_INET, "eth0", "10.200.1.8", 24, "", false).Header()),
            0);
  runs = vorntest::HookRuns();
  ASSERT_EQ(runs.size(), 2u);
  EXPECT_EQ(runs[1].env["ORIGIN_ADDRESS"], "10.200.1.7");
  EXPECT_EQ(runs[1].env["NEW_ADDRESS"], "10.200.1.8");
}

TEST_F(NetlinkModuleTest, IPv4LabelNamesTheInterface) {
  EXPECT_EQ(module.CheckIPChangeEvent(
                AddrMessage(RTM_NEWADDR, AF_INET, "eth0", "10.200.1.20", 24, "eth0:1").Header()),
            0);
  EXPECT_EQ(module.GetIPv4Map().Get("eth0:1"), "10.200.1.20");
  EXPECT_FALSE(module.GetIPv4Map().Has("eth0"));
}

TEST_F(NetlinkModuleTest, IPv6AddedTwiceRunsOneHook) {
  auto add = [&](const char* ip) {
    return module.CheckIPChangeEvent(
        AddrMessage(RTM_NEWADDR, AF_INET6, "eth0", ip, 64).Header());
  };
  auto del = [&](const char* ip) {
    return module.CheckIPChangeEvent(
        AddrMessage(RTM_DELADDR, AF_INET6, "eth0", ip, 64).Header());
  };
  EXPECT_EQ(add("2001:db8::5"), 0);
  EXPECT_EQ(add("2001:db8::5"), 0);
  auto runs = vorntest::HookRuns();
  ASSERT_EQ(runs.size(), 1u);
  EXPECT_EQ(runs[0].program, "/usr/vorn/etc/hooks/net/ipv6_change/10-record");
  EXPECT_EQ(runs[0].env["ORIGIN_ADDRESS"], "");
  EXPECT_EQ(runs[0].env["NEW_ADDRESS"], "2001:db8::5");
  EXPECT_EQ(runs[0].env["PREFIX_LENGTH"], "64");
  EXPECT_EQ(add("2001:db8::6"), 0);
  EXPECT_EQ(add("fe80::1"), 0);
  runs = vorntest::HookRuns();
  ASSERT_EQ(runs.size(), 3u);
  EXPECT_EQ(runs[1].env["ORIGIN_ADDRESS"], "2001:db8::5");
  EXPECT_EQ(runs[2].env["ORIGIN_ADDRESS"], "2001:db8::5,2001:db8::6");
  // A delete runs no hook and keeps the order of the rest.
  EXPECT_EQ(del("2001:db8::6"), 0);
  EXPECT_EQ(vorntest::HookRuns().size(), 3u);
  EXPECT_EQ(module.GetIPv6Map().at("eth0"),
            (std::vector<std::string>{"2001:db8::5", "fe80::1"}));
  EXPECT_EQ(add("2001:db8::6"), 0);
  runs = vorntest::HookRuns();
  ASSERT_EQ(runs.size(), 4u);
  EXPECT_EQ(runs[3].env["ORIGIN_ADDRESS"], "2001:db8::5,fe80::1");
}

TEST_F(NetlinkModuleTest, IPv6DeleteOfAnUnknownAddressDoesNothing) {
  EXPECT_EQ(module.CheckIPChangeEvent(
                AddrMessage(RTM_DELADDR, AF_INET6, "eth0", "2001:db8::99", 64).Header()),
            0);
  EXPECT_TRUE(vorntest::HookRuns().empty());
  EXPECT_EQ(module.GetIPv6Map().count("eth0"), 0u);
}

TEST_F(NetlinkModuleTest, AddressMessagesWithoutAddressOrKnownFamily) {
  ifaddrmsg a;
  std::memset(&a, 0, sizeof a);
  a.ifa_family = AF_INET;
  a.ifa_index = if_nametoindex("eth0");
  vorntest::NlMessage empty(RTM_NEWADDR);
  empty.Body(a).Attr(IFA_LABEL, std::string("eth0"));
  EXPECT_EQ(module.CheckIPChangeEvent(empty.Header()), -1);

  a.ifa_family = AF_PACKET;
  vorntest::NlMessage other(RTM_NEWADDR);
  other.Body(a).Attr4(IFA_ADDRESS, "10.1.1.1");
  EXPECT_EQ(module.CheckIPChangeEvent(other.Header()), -1);

  a.ifa_family = AF_INET;
  a.ifa_index = 0x7fff0000;  // no such interface and no label
  vorntest::NlMessage gone(RTM_DELADDR);
  gone.Body(a).Attr4(IFA_ADDRESS, "10.1.1.1");
  EXPECT_EQ(module.CheckIPChangeEvent(gone.Header()), -1);
  EXPECT_TRUE(vorntest::HookRuns().empty());
  EXPECT_EQ(module.GetIPv4Map().Size(), 0u);
}

// --- routes ---------------------------------------------------------------------------------------

TEST_F(NetlinkModuleTest, MainTableRouteRunsTheGatewayHook) {
  EXPECT_EQ(module.CheckRouteChangeEvent(
                RouteMessage(RTM_NEWROUTE, RT_TABLE_MAIN, "eth0", "10.50.0.0", 16, "10.200.1.1")
                    .Header()),
            0);
  EXPECT_EQ(module.CheckRouteChangeEvent(
                RouteMessage(RTM_DELROUTE, RT_TABLE_MAIN, "eth0", "", 0, "10.200.1.1").Header()),
            0);
  auto runs = vorntest::HookRuns();
  ASSERT_EQ(runs.size(), 2u);
  EXPECT_EQ(runs[0].program, "/usr/vorn/etc/hooks/net/gateway_change/10-record");
  EXPECT_EQ(runs[0].args, std::vector<std::string>{"5"});
  EXPECT_EQ(runs[0].env["ACTION"], "NEW");
  EXPECT_EQ(runs[0].env["IFNAME"], "eth0");
  EXPECT_EQ(runs[0].env["DESTINATION"], "10.50.0.0");
  EXPECT_EQ(runs[0].env["GATEWAY"], "10.200.1.1");
  EXPECT_EQ(runs[1].env["ACTION"], "DEL");
  EXPECT_EQ(runs[1].env["DESTINATION"], "0.0.0.0");  // the default route
  EXPECT_EQ(runs[1].env["GATEWAY"], "10.200.1.1");
}

TEST_F(NetlinkModuleTest, OtherTablesRunNoHook) {
  EXPECT_EQ(module.CheckRouteChangeEvent(
                RouteMessage(RTM_NEWROUTE, RT_TABLE_DEFAULT, "eth0", "", 0, "10.200.1.1").Header()),
            -1);
  EXPECT_EQ(module.CheckRouteChangeEvent(
                RouteMessage(RTM_NEWROUTE, RT_TABLE_LOCAL, "eth0", "10.200.1.2", 32, "").Header()),
            -1);
  EXPECT_EQ(module.CheckRouteChangeEvent(
                RouteMessage(RTM_DELROUTE, 100, "eth0", "", 0, "10.200.1.1").Header()),
            -1);
  EXPECT_EQ(module.CheckRouteChangeEvent(nullptr), -1);
  EXPECT_TRUE(vorntest::HookRuns().empty());
}

TEST_F(NetlinkModuleTest, RouteWithoutInterfaceIsNotFired) {
  // No RTA_OIF: the hook is built without IFNAME and is not valid, so nothing runs.
  EXPECT_EQ(module.CheckRouteChangeEvent(
                RouteMessage(RTM_NEWROUTE, RT_TABLE_MAIN, "", "10.60.0.0", 16, "").Header()),
            0);
  EXPECT_TRUE(vorntest::HookRuns().empty());
}

// --- present state, DHCP ---------------------------------------------------------------------------

TEST_F(NetlinkModuleTest, InitInterfaceRecordsThePresentState) {
  vorntest::IpOk({"link", "add", "br9", "type", "bridge"});  // down, no address
  ASSERT_EQ(module.InitInterface(), 0);
  EXPECT_TRUE(module.GetLinkMap().Get("eth0"));
  EXPECT_EQ(module.GetIPv4Map().Get("eth0"), "10.200.1.2");
  ASSERT_TRUE(module.GetLinkMap().Has("br9"));
  EXPECT_FALSE(module.GetLinkMap().Get("br9"));
  EXPECT_FALSE(module.GetIPv4Map().Has("br9"));
  EXPECT_FALSE(module.GetLinkMap().Has("lo"));
  EXPECT_TRUE(module.GetIPv6Map().empty());
  // The first message now compares with the present state.
  EXPECT_EQ(module.CheckNewLinkEvent(LinkMessage("eth0", kUp).Header()), 0);
  EXPECT_EQ(module.CheckIPChangeEvent(
                AddrMessage(RTM_NEWADDR, AF_INET, "eth0", "10.200.1.2", 24).Header()),
            0);
  EXPECT_TRUE(vorntest::LinkEvents().empty());
  EXPECT_TRUE(vorntest::HookRuns().empty());
}

TEST_F(NetlinkModuleTest, RequestDHCPIP) {
  const std::string action = "/usr/vorn/libexec/platform/VORNNetSetCard1";
  ASSERT_TRUE(vorntest::InstallFake(action));
  EXPECT_EQ(module.RequestDHCPIP("wlan0"), 0);  // never for Wi-Fi
  EXPECT_EQ(module.RequestDHCPIP("eth0"), -1);  // not on DHCP
  Ifcfg("eth0", "DEVICE=eth0\nBOOTPROTO=dhcp\n");
  EXPECT_EQ(module.RequestDHCPIP("eth0"), 0);
  auto calls = vorntest::FakeCallsTo(action);
  ASSERT_EQ(calls.size(), 1u);
  EXPECT_EQ(calls[0].argv, (std::vector<std::string>{"eth0", "0", "10.200.1.2", "255.255.255.0"}));

  vorntest::SyslogCapture log;
  Ifcfg("nosuch0", "BOOTPROTO=dhcp\n");
  EXPECT_EQ(module.RequestDHCPIP("nosuch0"), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Get nosuch0 net info failed"))) << log.Dump();

  Json::Value failing;
  failing["exit"] = 2;
  ASSERT_TRUE(vorntest::AddFakeReply(action, failing));
  EXPECT_EQ(module.RequestDHCPIP("eth0"), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "VORNNetSetCard1_S failed, vornerr=[0x0400]")))
      << log.Dump();

  // A bridge port is left alone.
  vorntest::IpOk({"link", "add", "br9", "type", "bridge"});
  vorntest::IpOk({"link", "set", "eth0", "master", "br9"});
  EXPECT_EQ(module.RequestDHCPIP("eth0"), -1);
  vorntest::IpOk({"link", "set", "eth0", "nomaster"});
  EXPECT_EQ(vorntest::FakeCallsTo(action).size(), 2u);
}

// --- the thread ------------------------------------------------------------------------------------

TEST_F(NetlinkModuleTest, ThreadWithoutSocketEndsByItself) {
  vorntest::SyslogCapture log;
  EXPECT_EQ(module.StartModule(), 0);
  ASSERT_TRUE(vorntest::WaitFor(
      [&] { return !log.Matching(LogLine(kFile, "Bad RTNETLINK fd [-1]")).empty(); }));
  EXPECT_EQ(module.TerminateModule(), 0);
  // It ended with 0, not by cancellation.
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "netlink thread is not cancelled")))
      << log.Dump();
  EXPECT_EQ(log.Matching("Failed to cancel").size(), 0u);
}

TEST_F(NetlinkModuleTest, RecvFailureIsLogged) {
  vorntest::SyslogCapture log;
  EXPECT_EQ(module.AnalysisNetlinkMessage(), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "recvmsg ret: [-1] from fd [-1].")))
      << log.Dump();
}

// --- any bytes ---------------------------------------------------------------------------------

// Datagrams of real shape with random bytes changed, cut short or lengthened, read through the
// module's own socket as the kernel's would be: none may crash or read outside the datagram
// (the sanitizer build watches that), and the watcher still works afterwards.
TEST_F(NetlinkModuleTest, SeededRandomDatagramsNeverHarmTheWatcher) {
  vorntest::RemoveHooks();  // nothing runs behind the events, so the storm is quick
  vorntest::Run({"/bin/rm", "-rf", "/usr/vorn/libexec/platform"});
  ASSERT_EQ(module.Initialize(), 0);
  const int fd = module.GetNetlinkFd();
  const std::vector<std::string> seeds = {
      LinkMessage("eth0", kUp).Bytes(),
      LinkMessage("eth0", kDown | IFF_SLAVE).Bytes(),
      AddrMessage(RTM_NEWADDR, AF_INET, "eth0", "10.200.1.9", 24, "eth0:1").Bytes(),
      AddrMessage(RTM_DELADDR, AF_INET6, "eth0", "fd00::9", 64).Bytes(),
      RouteMessage(RTM_NEWROUTE, 254, "eth0", "10.9.0.0", 16, "10.200.1.1").Bytes(),
      LinkMessage("eth0", kUp).Bytes() + AddrMessage(RTM_NEWADDR, AF_INET, "eth0", "10.200.1.8",
                                                     24).Bytes(),
  };
  std::mt19937 rng(20261122);
  for (int i = 0; i < 4000; ++i) {
    std::string d = seeds[rng() % seeds.size()];
    const int changes = 1 + static_cast<int>(rng() % 6);
    for (int c = 0; c < changes; ++c) d[rng() % d.size()] = static_cast<char>(rng() & 0xff);
    switch (rng() % 4) {
      case 0:
        d.resize(rng() % d.size());
        break;
      case 1:
        for (int k = static_cast<int>(rng() % 40); k > 0; --k) d += static_cast<char>(rng());
        break;
      default:
        break;
    }
    if (d.empty()) continue;
    ASSERT_TRUE(vorntest::SendToSocket(fd, d)) << i;
    module.AnalysisNetlinkMessage();
  }
  // The storm may have left any state behind; a fresh address on eth0 is still reported.
  ASSERT_TRUE(vorntest::InstallRecordingHook("net/ipv4_change", "10-record"));
  vorntest::ClearHookRuns();
  ASSERT_TRUE(vorntest::SendToSocket(
      fd, AddrMessage(RTM_NEWADDR, AF_INET, "eth0", "10.200.1.250", 24).Bytes()));
  // Read whatever is queued (the kernel may have added messages of its own meanwhile).
  pollfd p = {fd, POLLIN, 0};
  while (poll(&p, 1, 200) > 0) module.AnalysisNetlinkMessage();
  int reported = 0;
  for (auto& run : vorntest::HookRuns()) reported += run.env["NEW_ADDRESS"] == "10.200.1.250";
  EXPECT_EQ(reported, 1);
  EXPECT_EQ(module.Terminate(), 0);
}

}  // namespace
