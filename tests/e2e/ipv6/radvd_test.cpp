// The router advertisement watch inside the real vornnetd. The peer host of eth0 runs a real
// radvd (flags changed by rewriting its file and SIGHUP); other routers and malformed packets
// come from scapy in the same peer host; ndisc6 asks the kernel of the peer. What is checked is
// what the appliance sees: the mode the platform is given, vornnetd's IPv6 gateway list, the
// kernel's default route and the daemon's log.
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <memory>

#include "fixtures/fake_journal.h"
#include "ipv6_e2e_support.h"
#include "support/daemon_process.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"

namespace {

using ipv6e2e::InPeer;
using ipv6e2e::V6Gateways;
using ipv6e2e::WaitFor;
using vorntest::DaemonProcess;

const char kConfSet[] = "/usr/vorn/libexec/platform/VORNNetIPv6ConfSet";
const char kRadvdConf[] = "/run/vorn/radvd.conf";
const char kIfcfg[] = "/etc/sysconfig/network-scripts/ifcfg-eth0";
const char kLog[] = "network/ipv6/ipv6_module.cpp";

std::vector<std::string> ModesSet() {
  std::vector<std::string> out;
  for (auto const& c : vorntest::FakeCallsTo(kConfSet)) {
    out.push_back(c.argv.size() >= 2 ? c.argv[0] + " " + c.argv[1] : "?");
  }
  return out;
}

void Sysctl(const std::string& key, const std::string& value) {
  std::string path = "/proc/sys/net/ipv6/conf/" + key;
  vorntest::WriteFile(path, value + "\n");
}

class RadvdTest : public testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    // The kernel must not follow the RAs itself: the default route is vornnetd's.
    for (const char* i : {"all", "default", "eth0", "eth1"}) {
      Sysctl(std::string(i) + "/accept_ra", "0");
      Sysctl(std::string(i) + "/autoconf", "0");
    }
    vorntest::Ip({"-6", "route", "flush", "exact", "::/0"});
    vorntest::Ip({"link", "del", "lbr0"});
    for (const char* f : {"gateway_v4_priority", "gateway_v6_priority", "gateway_database",
                          "resolv4.conf", "resolv6.conf"}) {
      unlink((std::string("/etc/iproute2/config/") + f).c_str());
    }
    vorntest::Run({"/bin/mkdir", "-p", "/etc/sysconfig/network-scripts", "/run/vorn"});
    unlink(kIfcfg);
    ASSERT_EQ(0, InPeer("eth0", {"/bin/sh", "-c",
                                 "echo 1 > /proc/sys/net/ipv6/conf/all/forwarding"})
                     .status);
    peerLL_ = ipv6e2e::LinkLocal("eth0", true);
    ASSERT_FALSE(peerLL_.empty());
    ASSERT_FALSE(ipv6e2e::LinkLocal("eth0", false).empty());
    ASSERT_TRUE(vorntest::InstallFake(kConfSet));
    ASSERT_TRUE(vorntest::InstallFake("/usr/vorn/libexec/platform/VORNNetGatewayConfigChangeHook"));
    ASSERT_TRUE(vorntest::InstallFake("/usr/vorn/libexec/platform/VORNNetDnsConfigChangeHook"));
    vorntest::ClearFakeJournal();
    daemon_ = std::make_unique<DaemonProcess>(std::vector<std::string>{VORNNETD},
                                              "com.vornlink.net");
    ASSERT_TRUE(daemon_->ready());
  }
  void TearDown() override {
    radvd_.reset();
    if (daemon_) {
      EXPECT_EQ(0, daemon_->Stop(SIGTERM));
    }
    // A peer address taken away by a test comes back for the next.
    InPeer("eth0", {"/usr/sbin/ip", "link", "set", "eth0", "down"});
    InPeer("eth0", {"/usr/sbin/ip", "link", "set", "eth0", "up"});
  }

  void WriteRadvdConf(bool managed, bool other, bool prefix) {
    std::string conf = "interface eth0 {\n  AdvSendAdvert on;\n  MinRtrAdvInterval 3;\n"
                       "  MaxRtrAdvInterval 4;\n";
    conf += std::string("  AdvManagedFlag ") + (managed ? "on" : "off") + ";\n";
    conf += std::string("  AdvOtherConfigFlag ") + (other ? "on" : "off") + ";\n";
    if (prefix) conf += "  prefix 2001:db8:1::/64 {\n    AdvOnLink on;\n    AdvAutonomous on;\n  };\n";
    conf += "};\n";
    ASSERT_TRUE(vorntest::ReplaceFile(kRadvdConf, conf, 0644));
  }
  void StartRadvd(bool managed, bool other, bool prefix) {
    WriteRadvdConf(managed, other, prefix);
    ASSERT_EQ(0, vorntest::Run({"/usr/sbin/radvd", "-c", "-C", kRadvdConf}).status);
    radvd_ = std::make_unique<DaemonProcess>(
        std::vector<std::string>{"/usr/bin/nsenter", "-t", ipv6e2e::PeerPid("eth0"), "-n",
                                 "/usr/sbin/radvd", "-n", "-C", kRadvdConf, "-p",
                                 "/run/vorn/radvd.pid", "-m", "stderr"},
        "");
  }
  // New flags: the file is rewritten and radvd told to read it again (it advertises at once).
  void Reconfigure(bool managed, bool other, bool prefix) {
    WriteRadvdConf(managed, other, prefix);
    ASSERT_TRUE(radvd_ && radvd_->running());
    ASSERT_EQ(0, kill(radvd_->pid(), SIGHUP));
  }
  // A Router Solicitation from our side: radvd answers with an RA.
  void Solicit() { vorntest::Run({"/usr/bin/rdisc6", "-1", "eth0"}, "", 20); }
  // An RA from another router, sent with scapy from the peer host of ifname.
  void OtherRouter(const std::string& ifname, const std::string& from,
                   std::vector<std::string> args) {
    std::vector<std::string> argv = {ipv6e2e::Sender(), "ra", ifname, from};
    argv.insert(argv.end(), args.begin(), args.end());
    vorntest::RunResult r = InPeer(ifname, argv);
    ASSERT_EQ(0, r.status) << r.err;
  }
  bool WaitModes(std::vector<std::string> const& want) {
    return WaitFor([&]() { return ModesSet() == want; });
  }
  bool WaitLog(vorntest::SyslogCapture& log, std::string const& regex, size_t count = 1) {
    return WaitFor([&]() { return log.Matching(regex).size() >= count; });
  }
  // The first RA of radvd with M set has been applied.
  void ManagedApplied() {
    StartRadvd(true, false, false);
    ASSERT_TRUE(WaitModes({"2 eth0"})) << vorntest::ReadFile("/run/vorn/syslog.log");
    ASSERT_TRUE(WaitFor([&]() { return V6Gateways() == "eth0=" + peerLL_; })) << V6Gateways();
  }

  std::string peerLL_;
  std::unique_ptr<DaemonProcess> daemon_;
  std::unique_ptr<DaemonProcess> radvd_;
};

TEST_F(RadvdTest, ManagedRaGivesManagedModeGatewayEntryAndDefaultRoute) {
  ManagedApplied();
  EXPECT_TRUE(WaitFor([&]() {
    return ipv6e2e::DefaultRoute6().find("default via " + peerLL_ + " dev eth0") !=
           std::string::npos;
  })) << ipv6e2e::DefaultRoute6();
  std::vector<vorntest::FakeCall> calls = vorntest::FakeCallsTo(kConfSet);
  ASSERT_EQ(1u, calls.size());
  EXPECT_EQ((std::vector<std::string>{"2", "eth0", "", "0", ""}), calls[0].argv);
}

TEST_F(RadvdTest, ARepeatedRaChangesNothing) {
  ManagedApplied();
  vorntest::SyslogCapture log;
  for (int i = 0; i < 3; ++i) Solicit();
  ASSERT_TRUE(WaitLog(log, vorntest::LogLine(kLog, "State [1] does not change."), 3))
      << log.Dump();
  EXPECT_EQ((std::vector<std::string>{"2 eth0"}), ModesSet());
  EXPECT_EQ("eth0=" + peerLL_, V6Gateways());
}

TEST_F(RadvdTest, FlippingOGivesTheOtherMode) {
  StartRadvd(false, false, true);
  ASSERT_TRUE(WaitModes({"0 eth0"}));
  Reconfigure(false, true, true);
  ASSERT_TRUE(WaitModes({"0 eth0", "4 eth0"})) << vorntest::ReadFile("/run/vorn/syslog.log");
  Reconfigure(true, true, true);
  ASSERT_TRUE(WaitModes({"0 eth0", "4 eth0", "2 eth0"}));
  EXPECT_EQ("eth0=" + peerLL_, V6Gateways());
}

TEST_F(RadvdTest, NoPrefixAndMClearClearsTheContext) {
  ManagedApplied();
  vorntest::SyslogCapture log;
  Reconfigure(false, false, false);
  ASSERT_TRUE(WaitLog(log, vorntest::LogLine(kLog, "Ignore stateless RA which has no prefix "
                                                   "information.")))
      << log.Dump();
  EXPECT_EQ((std::vector<std::string>{"2 eth0"}), ModesSet());
  // The same router with M set again counts as a first RA.
  Reconfigure(true, false, false);
  ASSERT_TRUE(WaitModes({"2 eth0", "2 eth0"}));
}

TEST_F(RadvdTest, ASecondRouterIsIgnoredWhileTheFirstAnswersAndTakesOverOnceItIsGone) {
  ManagedApplied();
  vorntest::SyslogCapture log;
  OtherRouter("eth0", "fe80::2", {"--o", "--prefix", "2001:db8:2::"});
  ASSERT_TRUE(WaitLog(log, vorntest::LogLine(kLog, "Original gateway [" + peerLL_ +
                                                       "] reachable.")))
      << log.Dump();
  EXPECT_EQ("eth0=" + peerLL_, V6Gateways());
  EXPECT_EQ((std::vector<std::string>{"2 eth0"}), ModesSet());

  // The first router goes away: radvd ends and its address leaves the link.
  radvd_.reset();
  ASSERT_EQ(0, vorntest::PeerIp("eth0", {"-6", "addr", "del", peerLL_ + "/64", "dev", "eth0"})
                   .status);
  OtherRouter("eth0", "fe80::2", {"--o", "--prefix", "2001:db8:2::"});
  ASSERT_TRUE(WaitModes({"2 eth0", "4 eth0"})) << log.Dump();
  EXPECT_TRUE(WaitFor([&]() { return V6Gateways() == "eth0=fe80::2"; })) << V6Gateways();
  EXPECT_TRUE(WaitFor([&]() {
    return ipv6e2e::DefaultRoute6().find("default via fe80::2 dev eth0") != std::string::npos;
  })) << ipv6e2e::DefaultRoute6();
}

TEST_F(RadvdTest, RasOnTheLanBridgeAreIgnored) {
  vorntest::IpOk({"link", "add", "lbr0", "type", "bridge"});
  vorntest::IpOk({"link", "set", "eth1", "master", "lbr0"});
  vorntest::IpOk({"link", "set", "lbr0", "up"});
  Sysctl("lbr0/accept_ra", "0");
  // The port forwards once the bridge has taken it up; until then an RA may be lost, so the
  // router repeats itself (every RA on the bridge is ignored alike).
  ASSERT_TRUE(WaitFor([]() {
    return vorntest::ReadFile("/sys/class/net/lbr0/operstate") == "up\n" &&
           vorntest::ReadFile("/sys/class/net/eth1/brport/state") == "3\n";
  }));
  vorntest::SyslogCapture log;
  const std::string seen =
      vorntest::LogLine(kLog, "Process RA from [fe80::9] on interface [lbr0]");
  for (int i = 0; i < 5 && log.Matching(seen).empty(); ++i) {
    OtherRouter("eth1", "fe80::9", {"--m"});
    WaitFor([&]() { return !log.Matching(seen).empty(); }, 2);
  }
  ASSERT_FALSE(log.Matching(seen).empty()) << log.Dump();
  usleep(300000);
  EXPECT_TRUE(ModesSet().empty());
  EXPECT_EQ("", V6Gateways());
  vorntest::Ip({"link", "del", "lbr0"});
}

TEST_F(RadvdTest, RasOnARouterWanAreIgnored) {
  ASSERT_TRUE(vorntest::WriteFile(kIfcfg, "DEVICE=eth0\nIPV6ROUTER=yes\n"));
  vorntest::SyslogCapture log;
  StartRadvd(true, false, true);
  ASSERT_TRUE(WaitLog(log, vorntest::LogLine(kLog, "Process RA from [" + peerLL_ +
                                                       "] on interface [eth0]")))
      << log.Dump();
  Solicit();
  ASSERT_TRUE(WaitLog(log, "Process RA from", 2));
  EXPECT_TRUE(ModesSet().empty());
  EXPECT_EQ("", V6Gateways());
  EXPECT_EQ(std::string::npos, ipv6e2e::DefaultRoute6().find("default"));
}

TEST_F(RadvdTest, ResetIpv6MakesTheNextRaApplyAgain) {
  ManagedApplied();
  vorntest::SyslogCapture log;
  Solicit();
  ASSERT_TRUE(WaitLog(log, vorntest::LogLine(kLog, "State [1] does not change.")));
  vorntest::RunResult r = vorntest::Run({VORNNETDTOOL, "reset-ipv6", "eth0"});
  ASSERT_EQ(0, r.status) << r.err;
  Solicit();
  ASSERT_TRUE(WaitModes({"2 eth0", "2 eth0"})) << log.Dump();
  EXPECT_EQ("eth0=" + peerLL_, V6Gateways());
}

TEST_F(RadvdTest, MalformedPacketsChangeNothing) {
  ManagedApplied();
  // radvd goes quiet (its farewell RAs included), so that only the malformed packets arrive: a
  // stateless RA without a usable prefix clears the interface's context, and radvd's next RA
  // would then be applied afresh.
  {
    vorntest::SyslogCapture farewell;
    radvd_.reset();
    WaitLog(farewell, "State \\[1\\] does not change", 1);
    usleep(500000);
  }
  const std::string before = V6Gateways();
  const std::vector<std::string> modes = ModesSet();
  vorntest::SyslogCapture log;
  for (const char* kind : {"zero-option", "long-option", "rs", "short-ra", "prefix-len1"}) {
    vorntest::RunResult r = InPeer("eth0", {ipv6e2e::Sender(), "malformed", "eth0", "fe80::66", kind});
    ASSERT_EQ(0, r.status) << kind << ": " << r.err;
  }
  ASSERT_TRUE(WaitLog(log, vorntest::LogLine(kLog, "zero length option in RA")));
  ASSERT_TRUE(WaitLog(log, "option length greater than total length in RA \\(type 3, optlen 64"));
  ASSERT_TRUE(WaitLog(log, "Drop a router advertisement of 8 bytes on \\[eth0\\]"));
  ASSERT_TRUE(WaitLog(log, "Drop a prefix option of 8 bytes in RA on \\[eth0\\]"));
  // Three stateless RAs without a usable prefix, from another router.
  ASSERT_TRUE(WaitLog(log, "Ignore stateless RA which has no prefix information", 3));
  EXPECT_TRUE(log.Matching("icmpv6 filter failed").empty());
  EXPECT_EQ(before, V6Gateways());
  EXPECT_EQ(modes, ModesSet());
  EXPECT_TRUE(daemon_->running());
}

TEST_F(RadvdTest, TenThousandRandomDatagramsNeitherCrashNorHang) {
  // No router on the link: every RA is judged on its own bytes.
  vorntest::SyslogCapture log;
  unlink(kConfSet);  // the platform's answer is not under test here
  vorntest::RunResult r =
      InPeer("eth0", {ipv6e2e::Sender(), "random", "eth0", "fe80::66", "10000", "20261125"}, 300);
  ASSERT_EQ(0, r.status) << r.err;
  // The daemon is still there and answers; every entry it made is eth0's, from the sender.
  vornnetwork::dbus::NetClient client;
  Json::Value request, result;
  request["type"] = "GTYPE_V6";
  ASSERT_GE(client.GetGatewayListData(request, result), 0);
  const std::string list = V6Gateways();
  EXPECT_TRUE(list == "" || list == "eth0=fe80::66") << list;
  EXPECT_TRUE(daemon_->running());
  // Some of the flood reaches the watch (how much depends on the machine's load).
  EXPECT_GT(log.Matching("Process RA from \\[fe80::66\\] on interface \\[eth0\\]").size(), 0u);
  EXPECT_EQ(0, daemon_->Stop(SIGTERM));
  daemon_.reset();
}

}  // namespace
