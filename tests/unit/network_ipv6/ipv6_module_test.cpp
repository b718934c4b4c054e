// The decisions of the router advertisement watch on eth0, whose peer host is a real router
// for ndisc6: which RA is taken, what goes to the route module, which mode the platform gets,
// the 900-second rule through a clock seam, ResetIPv6Module, and the module's life cycle.
#include <gtest/gtest.h>
#include <unistd.h>

#include <atomic>
#include <regex>
#include <thread>

#include "fixtures/fake_journal.h"
#include "ipv6_test_support.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "vornwireless/network/ipv6/ipv6_module.h"
#include "vornwireless/network/module_manager.h"

namespace {

using ipv6test::Bytes;
using ipv6test::PrefixOption;
using ipv6test::Ra;
using vornnetwork::network::module::BaseModule;
using vornnetwork::network::module::InterfaceContext;
using vornnetwork::network::module::IPv6Module;
using vornnetwork::network::module::ModuleManager;
using vornnetwork::network::module::MODULE_ROUTE;

const char kFile[] = "network/ipv6/ipv6_module.cpp";
const char kConfSet[] = "/usr/vorn/libexec/platform/VORNNetIPv6ConfSet";
const char kConfGet[] = "/usr/vorn/libexec/platform/VORNNetIPv6ConfGet";
const char kIfcfg[] = "/etc/sysconfig/network-scripts/ifcfg-eth0";
const char kSilent[] = "fe80::dead:beef";  // nobody on the link has it

// Stands in for the route module: keeps every request.
class RecordingRoute : public BaseModule {
 public:
  RecordingRoute() : BaseModule(MODULE_ROUTE) {}
  static BaseModule* Create() { return new RecordingRoute(); }
  int ProcessRequest(Json::Value const& request, Json::Value&) override {
    requests().push_back(request);
    return 0;
  }
  int InitialModule() override { return 0; }
  int TerminateModule() override { return 0; }
  int StartModule() override { return 0; }
  static std::vector<Json::Value>& requests() {
    static std::vector<Json::Value> r;
    return r;
  }
};

// The watch with its own clock.
class ClockedModule : public IPv6Module {
 public:
  time_t now = 1700000000;

 protected:
  time_t Now() const override { return now; }
};

// The link-local address of the peer end of eth0, once it is no longer tentative.
std::string PeerLinkLocal() {
  std::regex re("inet6 (fe80::[0-9a-f:]+)/64");
  for (int i = 0; i < 100; ++i) {
    vorntest::RunResult r = vorntest::PeerIp("eth0", {"-6", "addr", "show", "dev", "eth0"});
    vorntest::RunResult ours = vorntest::Ip({"-6", "addr", "show", "dev", "eth0"});
    std::smatch m;
    if (r.out.find("tentative") == std::string::npos &&
        ours.out.find("tentative") == std::string::npos && std::regex_search(r.out, m, re)) {
      return m[1];
    }
    usleep(100000);
  }
  return "";
}

// The argv of each VORNNetIPv6ConfSet call, as "MODE IF".
std::vector<std::string> ModesSet() {
  std::vector<std::string> out;
  for (auto const& c : vorntest::FakeCallsTo(kConfSet)) {
    out.push_back(c.argv.size() >= 2 ? c.argv[0] + " " + c.argv[1] : "?");
  }
  return out;
}

class IPv6ModuleTest : public testing::Test {
 protected:
  static void SetUpTestSuite() {
    ModuleManager::MODULE_INFO info = {MODULE_ROUTE, true, &RecordingRoute::Create};
    ModuleManager::GetInstance().AddModule(info);
  }
  static void TearDownTestSuite() { ModuleManager::GetInstance().RemoveModule(MODULE_ROUTE); }
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    vorntest::Run({"/bin/mkdir", "-p", "/etc/sysconfig/network-scripts"});
    unlink(kIfcfg);
    unlink(kConfGet);
    ASSERT_TRUE(vorntest::InstallFake(kConfSet));
    vorntest::ClearFakeJournal();
    RecordingRoute::requests().clear();
  }
  void Feed(std::string const& from, Bytes const& ra, std::string const& ifname = "eth0") {
    module.ProcessRA(from, ifname, ra.data(), static_cast<int>(ra.size()), (ra[5] & 0x80) != 0,
                     (ra[5] & 0x40) != 0);
  }
  ClockedModule module;
};

Bytes Managed() { return Ra(true, false); }
Bytes Stateless() { return Ra(false, false, {PrefixOption("2001:db8:1::")}); }
Bytes StatelessOther() { return Ra(false, true, {PrefixOption("2001:db8:1::")}); }

TEST_F(IPv6ModuleTest, ManagedRaWithoutPrefixIsAcceptedAndSentOn) {
  Feed("fe80::1", Managed());
  ASSERT_EQ(1u, RecordingRoute::requests().size());
  Json::Value const& r = RecordingRoute::requests()[0];
  EXPECT_EQ("GTYPE_V6", r["type"].asString());
  EXPECT_EQ(-2, r["priority"].asInt());
  EXPECT_EQ("eth0", r["ifname"].asString());
  EXPECT_EQ("fe80::1", r["gateway"].asString());
  EXPECT_EQ("NULL", r["dns"].asString());
  EXPECT_EQ("ADD_GATEWAY_DATA", r["method"].asString());
  EXPECT_EQ(6u, r.size());
  EXPECT_EQ((std::vector<std::string>{"2 eth0"}), ModesSet());
  InterfaceContext c = module.GetContext("eth0");
  EXPECT_EQ("fe80::1", c.gateway);
  EXPECT_EQ(module.now, c.lastRaTime);
  EXPECT_EQ(1, c.state);
}

TEST_F(IPv6ModuleTest, EachFlagCombinationGivesItsStateAndMode) {
  Feed("fe80::1", Stateless());
  EXPECT_EQ(2, module.GetContext("eth0").state);
  Feed("fe80::1", StatelessOther());
  EXPECT_EQ(3, module.GetContext("eth0").state);
  Feed("fe80::1", Ra(true, true));
  EXPECT_EQ(1, module.GetContext("eth0").state);
  EXPECT_EQ((std::vector<std::string>{"0 eth0", "4 eth0", "2 eth0"}), ModesSet());
  EXPECT_EQ(3u, RecordingRoute::requests().size());
}

TEST_F(IPv6ModuleTest, StatelessRaWithoutAutonomousPrefixClearsTheContext) {
  Feed("fe80::1", Managed());
  vorntest::ClearFakeJournal();
  RecordingRoute::requests().clear();
  vorntest::SyslogCapture log;
  Feed("fe80::1", Ra(false, true, {PrefixOption("2001:db8:1::", 0x80)}));
  bool exists = false;
  InterfaceContext c = module.GetContext("eth0", &exists);
  EXPECT_TRUE(exists);
  EXPECT_EQ("", c.gateway);
  EXPECT_EQ(0, c.lastRaTime);
  EXPECT_EQ(0, c.state);
  EXPECT_TRUE(RecordingRoute::requests().empty());
  EXPECT_TRUE(ModesSet().empty());
  EXPECT_TRUE(log.HasOnce(LOG_INFO, vorntest::LogLine(kFile, "Ignore stateless RA which has no "
                                                             "prefix information.")))
      << log.Dump();
}

TEST_F(IPv6ModuleTest, TheSameRouterWithTheSameFlagsOnlyMovesTheTime) {
  Feed("fe80::1", Stateless());
  module.now += 30;
  vorntest::SyslogCapture log;
  Feed("fe80::1", Stateless());
  EXPECT_EQ(1u, RecordingRoute::requests().size());
  EXPECT_EQ(1u, ModesSet().size());
  EXPECT_EQ(module.now, module.GetContext("eth0").lastRaTime);
  EXPECT_TRUE(log.HasOnce(LOG_INFO, vorntest::LogLine(kFile, "State [2] does not change.")))
      << log.Dump();
}

TEST_F(IPv6ModuleTest, TheSameRouterChangingOGivesANewRequestAndMode) {
  Feed("fe80::1", Stateless());
  Feed("fe80::1", StatelessOther());
  EXPECT_EQ(2u, RecordingRoute::requests().size());
  EXPECT_EQ((std::vector<std::string>{"0 eth0", "4 eth0"}), ModesSet());
  Feed("fe80::1", Stateless());
  EXPECT_EQ((std::vector<std::string>{"0 eth0", "4 eth0", "0 eth0"}), ModesSet());
}

TEST_F(IPv6ModuleTest, StateChangeRules) {
  // State 1 changes only when M clears; state 2 unless both are clear; state 3 unless M clear
  // and O set; no state always.
  EXPECT_TRUE(module.IsRaStateChange("eth0", false, false));
  Feed("fe80::1", Managed());
  EXPECT_FALSE(module.IsRaStateChange("eth0", true, false));
  EXPECT_FALSE(module.IsRaStateChange("eth0", true, true));
  EXPECT_TRUE(module.IsRaStateChange("eth0", false, true));
  Feed("fe80::1", Stateless());
  EXPECT_FALSE(module.IsRaStateChange("eth0", false, false));
  EXPECT_TRUE(module.IsRaStateChange("eth0", false, true));
  EXPECT_TRUE(module.IsRaStateChange("eth0", true, false));
  Feed("fe80::1", StatelessOther());
  EXPECT_FALSE(module.IsRaStateChange("eth0", false, true));
  EXPECT_TRUE(module.IsRaStateChange("eth0", false, false));
  EXPECT_TRUE(module.IsRaStateChange("eth0", true, true));
}

TEST_F(IPv6ModuleTest, ASecondRouterIsIgnoredWhileTheFirstAnswersUntil900Seconds) {
  const std::string first = PeerLinkLocal();
  ASSERT_FALSE(first.empty());
  EXPECT_TRUE(vorntest::Run({"/usr/bin/ndisc6", first, "eth0"}).out.find(
                  "Target link-layer address") != std::string::npos);
  Feed(first, Managed());
  const time_t accepted = module.now;
  vorntest::SyslogCapture log;
  module.now = accepted + 899;
  Feed("fe80::2", Stateless());
  EXPECT_EQ(first, module.GetContext("eth0").gateway);
  EXPECT_EQ(1u, RecordingRoute::requests().size());
  EXPECT_TRUE(log.HasOnce(LOG_INFO, vorntest::LogLine(kFile, "Original gateway [" + first +
                                                                 "] reachable.")))
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_INFO, vorntest::LogLine(kFile, "difftime = 899.000000")));

  module.now = accepted + 901;
  Feed("fe80::2", Stateless());
  EXPECT_EQ("fe80::2", module.GetContext("eth0").gateway);
  EXPECT_EQ(2, module.GetContext("eth0").state);
  ASSERT_EQ(2u, RecordingRoute::requests().size());
  EXPECT_EQ("fe80::2", RecordingRoute::requests()[1]["gateway"].asString());
  EXPECT_EQ((std::vector<std::string>{"2 eth0", "0 eth0"}), ModesSet());
}

TEST_F(IPv6ModuleTest, TheFirstRouterAdvertisingAgainRestartsThe900Seconds) {
  const std::string first = PeerLinkLocal();
  ASSERT_FALSE(first.empty());
  Feed(first, Managed());
  module.now += 600;
  Feed(first, Managed());
  module.now += 600;  // 1200 s after the first RA, 600 s after the last
  Feed("fe80::2", Managed());
  EXPECT_EQ(first, module.GetContext("eth0").gateway);
}

TEST_F(IPv6ModuleTest, TheAgeOfTheLastRaCountsBothWaysWhenTheClockJumps) {
  Feed("fe80::1", Managed());
  module.now -= 899;
  EXPECT_FALSE(module.IsRaExchangeable("eth0"));
  module.now -= 2;
  EXPECT_TRUE(module.IsRaExchangeable("eth0"));
}

TEST_F(IPv6ModuleTest, ASecondRouterTakesOverAtOnceWhenTheFirstDoesNotAnswer) {
  Feed(kSilent, Managed());
  module.now += 5;
  Feed("fe80::2", StatelessOther());
  InterfaceContext c = module.GetContext("eth0");
  EXPECT_EQ("fe80::2", c.gateway);
  EXPECT_EQ(module.now, c.lastRaTime);
  EXPECT_EQ(3, c.state);
  EXPECT_EQ((std::vector<std::string>{"2 eth0", "4 eth0"}), ModesSet());
}

TEST_F(IPv6ModuleTest, RaOnTheLanBridgeIsIgnoredAndClearsItsContext) {
  vorntest::SyslogCapture log;
  Feed("fe80::1", Managed(), "lbr0");
  bool exists = false;
  InterfaceContext c = module.GetContext("lbr0", &exists);
  EXPECT_TRUE(exists);
  EXPECT_EQ("", c.gateway);
  EXPECT_EQ(0, c.state);
  EXPECT_TRUE(RecordingRoute::requests().empty());
  EXPECT_TRUE(ModesSet().empty());
  EXPECT_TRUE(log.HasOnce(LOG_INFO, vorntest::LogLine(kFile, "Process RA from [fe80::1] on "
                                                             "interface [lbr0]")))
      << log.Dump();
}

TEST_F(IPv6ModuleTest, RaOnARouterWanIsIgnoredAndClearsItsContext) {
  Feed("fe80::1", Managed());
  ASSERT_TRUE(vorntest::WriteFile(kIfcfg, "DEVICE=eth0\nIPV6ROUTER=yes\n"));
  vorntest::ClearFakeJournal();
  RecordingRoute::requests().clear();
  Feed("fe80::1", Managed());
  EXPECT_EQ("", module.GetContext("eth0").gateway);
  EXPECT_TRUE(RecordingRoute::requests().empty());
  EXPECT_TRUE(ModesSet().empty());
  // "yes" at the start of the value is enough; "no" takes RAs again.
  ASSERT_TRUE(vorntest::WriteFile(kIfcfg, "IPV6ROUTER=\"yes please\"\n"));
  EXPECT_FALSE(module.Ipv6Enable("eth0"));
  ASSERT_TRUE(vorntest::WriteFile(kIfcfg, "IPV6ROUTER=no\n"));
  EXPECT_TRUE(module.Ipv6Enable("eth0"));
}

TEST_F(IPv6ModuleTest, StaticOrDisabledIpv6ModeDoesNotFollowRas) {
  vorntest::Run({"/bin/mkdir", "-p", "/usr/vorn/libexec/platform"});
  for (int mode = 0; mode <= 4; ++mode) {
    ASSERT_TRUE(vorntest::WriteFile(kConfGet, "#!/bin/sh\necho '" + std::to_string(mode) +
                                                  " :: 64 ::'\n",
                                    0755));
    EXPECT_EQ(mode != 1 && mode != 3, module.Ipv6Enable("eth0")) << "mode " << mode;
  }
  ASSERT_TRUE(vorntest::WriteFile(kConfGet, "#!/bin/sh\nexit 1\n", 0755));
  vorntest::SyslogCapture log;
  EXPECT_FALSE(module.Ipv6Enable("eth0"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, vorntest::LogLine(kFile, "Fail to get ipv6 config(eth0)")))
      << log.Dump();
  unlink(kConfGet);
}

TEST_F(IPv6ModuleTest, ResetMakesTheNextRaApplyEvenFromTheSameRouter) {
  Feed("fe80::1", Managed());
  Json::Value request(Json::objectValue), response;
  request["method"] = "RESET_IPV6_MODULE";
  request["ifname"] = "eth0";
  EXPECT_EQ(0, module.ProcessRequest(request, response));
  bool exists = true;
  module.GetContext("eth0", &exists);
  EXPECT_FALSE(exists);
  Feed("fe80::1", Managed());
  EXPECT_EQ(2u, RecordingRoute::requests().size());
  EXPECT_EQ((std::vector<std::string>{"2 eth0", "2 eth0"}), ModesSet());
}

TEST_F(IPv6ModuleTest, ResetDoesNotWaitForNdisc6AndLetsTheNewRouterIn) {
  Feed(kSilent, Managed());
  std::atomic<bool> done(false);
  // ndisc6 asks the silent gateway for seconds.
  std::thread ra([&]() {
    Feed("fe80::2", StatelessOther());
    done = true;
  });
  usleep(500000);
  Json::Value request(Json::objectValue), response;
  request["method"] = "RESET_IPV6_MODULE";
  request["ifname"] = "eth0";
  EXPECT_EQ(0, module.ProcessRequest(request, response));
  EXPECT_FALSE(done.load());
  ra.join();
  EXPECT_EQ("fe80::2", module.GetContext("eth0").gateway);
  EXPECT_EQ(3, module.GetContext("eth0").state);
}

TEST_F(IPv6ModuleTest, OtherRequestsAndBadRequestsChangeNothing) {
  Feed("fe80::1", Managed());
  Json::Value response;
  Json::Value other(Json::objectValue);
  other["method"] = "ADD_GATEWAY_DATA";
  other["ifname"] = "eth0";
  EXPECT_EQ(0, module.ProcessRequest(other, response));
  Json::Value badName(Json::objectValue);
  badName["method"] = "RESET_IPV6_MODULE";
  badName["ifname"] = 7;
  EXPECT_EQ(0, module.ProcessRequest(badName, response));
  EXPECT_EQ(0, module.ProcessRequest(Json::Value("text"), response));
  EXPECT_EQ("fe80::1", module.GetContext("eth0").gateway);
}

TEST_F(IPv6ModuleTest, PacketsOtherThanAdvertisementsAreNotProcessed) {
  sockaddr_in6 from;
  std::memset(&from, 0, sizeof from);
  inet_pton(AF_INET6, "fe80::1", &from.sin6_addr);
  vorntest::SyslogCapture log;
  const Bytes rs = {133, 0, 0, 0, 0, 0, 0, 0};
  module.HandlePacket(rs.data(), static_cast<int>(rs.size()), from, "eth0");
  const Bytes ns = {135, 0, 0, 0, 0, 0, 0, 0};
  module.HandlePacket(ns.data(), static_cast<int>(ns.size()), from, "eth0");
  const Bytes shortRa = {134, 0, 0, 0, 64, 0x80, 0, 0};
  module.HandlePacket(shortRa.data(), static_cast<int>(shortRa.size()), from, "eth0");
  EXPECT_TRUE(RecordingRoute::requests().empty());
  bool exists = true;
  module.GetContext("eth0", &exists);
  EXPECT_FALSE(exists);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, vorntest::LogLine(kFile, "icmpv6 filter failed"))) << log.Dump();
  EXPECT_EQ(1u, log.Matching("Drop a router advertisement of 8 bytes on \\[eth0\\]").size());
  EXPECT_TRUE(log.Matching("Process RA").empty());

  const Bytes ra = Managed();
  module.HandlePacket(ra.data(), static_cast<int>(ra.size()), from, "eth0");
  EXPECT_EQ(1u, RecordingRoute::requests().size());
}

TEST_F(IPv6ModuleTest, LifeCycleStartsAndStopsTheWatchThread) {
  IPv6Module real;
  EXPECT_EQ(0, real.Initialize());
  EXPECT_GE(real.GetSocket(), 0);
  EXPECT_EQ(0, real.Start());
  // ResetIPv6Module from another thread while the watch runs.
  Json::Value request(Json::objectValue), response;
  request["method"] = "RESET_IPV6_MODULE";
  request["ifname"] = "eth0";
  for (int i = 0; i < 100; ++i) EXPECT_EQ(0, real.ProcessRequest(request, response));
  EXPECT_EQ(0, real.Terminate());
  EXPECT_EQ(-1, real.GetSocket());
  // Started again after a stop.
  EXPECT_EQ(0, real.Initialize());
  EXPECT_EQ(0, real.Start());
  EXPECT_EQ(0, real.Terminate());
}

}  // namespace
