// What an adapter can do, learnt from the radio tools or known for the built-in radios, and the
// check of a record against it. The radio seam is preloaded into this test.
#include "vornwireless/wifi/adapter_capability.h"

#include <unistd.h>

#include <gtest/gtest.h>

#include <functional>
#include <map>
#include <regex>
#include <typeinfo>

#include "fixtures/fake_journal.h"
#include "fixtures/fake_radio.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "vornwireless/wifi/adapter.h"
#include "vornwireless/wifi/utils.h"

using namespace vornwireless::wifi;
using vorntest::IpOk;
using vorntest::LogLine;
using vorntest::SyslogCapture;

namespace {

Json::Value Scenario(const std::string& standards = "bgn") {
  Json::Value s;
  s["adapters"]["wlan0"] = vorntest::RadioAdapter("02:00:00:00:00:10", standards);
  s["adapters"]["wlan1"] = vorntest::RadioAdapter("02:00:00:00:00:20", "abgn");
  return s;
}

struct CapDeleter {
  void operator()(AdapterCapability* c) const { AdapterCapability::Delete(c); }
};
typedef std::unique_ptr<AdapterCapability, CapDeleter> Cap;

// A record every generic check accepts on a "bgn" radio.
AdapterConfig Valid(const std::string& ifname = "wlan0") {
  AdapterConfig c;
  c.interface = ifname;
  c.mode = WIFI_MODE_N;
  c.bandwidth = WIFI_BANDWIDTH_20_40MHZ;
  c.tx_power = WIFI_POWER_HIGH;
  c.security = WIFI_SECURITY_PERSONAL_WPA2;
  c.encryption = WIFI_ENCRYPTION_AES;
  c.guest_security = WIFI_SECURITY_DISABLED;
  c.guest_encryption = WIFI_ENCRYPTION_NONE;
  c.max_num_client = 256;
  c.guest_max_num_client = 256;
  return c;
}

bool IsUp(const std::string& ifname) {
  return (std::stoul(vorntest::ReadFile("/sys/class/net/" + ifname + "/flags"), nullptr, 16) & 1) != 0;
}

class Capability : public ::testing::Test {
 protected:
  static void SetUpTestSuite() {
    ASSERT_TRUE(vorntest::InSandbox());
    std::string why;
    ASSERT_TRUE(vorntest::InstallRadio(Scenario(), &why)) << why;
  }
  void SetUp() override {
    ASSERT_TRUE(vorntest::SetRadioScenario(Scenario()));
    vorntest::Run({"/bin/rm", "-f", "/usr/bin/get_key_value"});
    vorntest::ClearFakeJournal();
    Adapter::topology = WIFI_TOPOLOGY_ROUTER;
  }
  void TearDown() override { Adapter::topology = WIFI_TOPOLOGY_ERROR; }
  static Cap Generic(const std::string& ifname = "wlan0") {
    return Cap(AdapterCapability::Create(ifname, Valid(ifname)));
  }
};

}  // namespace

TEST_F(Capability, StandardsLettersGiveTheModesOfTheMap) {
  typedef std::vector<WIFI_MODE> M;
  EXPECT_EQ((M{WIFI_MODE_B, WIFI_MODE_G}), AdapterCapability::GetMode("802.11bg"));  // never "bg"
  EXPECT_EQ((M{WIFI_MODE_B, WIFI_MODE_BN, WIFI_MODE_G, WIFI_MODE_GN, WIFI_MODE_N}),
            AdapterCapability::GetMode("802.11bgn"));
  EXPECT_EQ((M{WIFI_MODE_A, WIFI_MODE_AN, WIFI_MODE_B, WIFI_MODE_BN, WIFI_MODE_G, WIFI_MODE_GN,
               WIFI_MODE_N}),
            AdapterCapability::GetMode("802.11abgn"));
  EXPECT_EQ(M{}, AdapterCapability::GetMode("802.11"));
  EXPECT_EQ(7u, AdapterCapability::modeMap.size());
}

TEST_F(Capability, GenericModesComeFromIwconfigEveryTime) {
  Cap cap = Generic();
  ASSERT_TRUE(cap);
  EXPECT_EQ((std::vector<WIFI_MODE>{WIFI_MODE_B, WIFI_MODE_BN, WIFI_MODE_G, WIFI_MODE_GN,
                                    WIFI_MODE_N}),
            cap->GetMode());
  ASSERT_TRUE(vorntest::SetRadioScenario(Scenario("bg")));
  EXPECT_EQ((std::vector<WIFI_MODE>{WIFI_MODE_B, WIFI_MODE_G}), cap->GetMode());
  auto calls = vorntest::FakeCallsTo("/sbin/iwconfig");
  ASSERT_EQ(2u, calls.size());
  EXPECT_EQ(std::vector<std::string>{"wlan0"}, calls[1].argv);
}

TEST_F(Capability, GenericChannelsComeFromIwlistAndTheHeadingIsLogged) {
  Cap cap = Generic();
  SyslogCapture log;
  std::vector<AdapterCapability::Channel> ch = cap->GetChannel();
  ASSERT_EQ(11u, ch.size());
  EXPECT_EQ(1u, ch[0].id);
  EXPECT_EQ("2.412", ch[0].frequency);
  EXPECT_EQ(11u, ch[10].id);
  EXPECT_EQ("2.462", ch[10].frequency);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/adapter_capability.cpp",
                                           "Failed to scan channels(wlan0, wlan0     11 channels "
                                           "in total; available frequencies :)")))
      << log.Dump();
  auto calls = vorntest::FakeCallsTo("/sbin/iwlist");
  ASSERT_EQ(1u, calls.size());
  EXPECT_EQ((std::vector<std::string>{"wlan0", "active_channel"}), calls[0].argv);
}

TEST_F(Capability, WithoutTheToolsGettersAreEmptyAndEveryAccessPointCheckFails) {
  ASSERT_EQ(0, vorntest::Run({"/bin/mv", "/sbin/iwconfig", "/sbin/iwconfig.away"}).status);
  ASSERT_EQ(0, vorntest::Run({"/bin/mv", "/sbin/iwlist", "/sbin/iwlist.away"}).status);
  Cap cap = Generic();
  SyslogCapture log;
  EXPECT_TRUE(cap->GetMode().empty());
  EXPECT_TRUE(cap->GetChannel().empty());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/adapter_capability.cpp", "Failed to get channel (wlan0)")));
  EXPECT_EQ(-1, cap->Verify(Valid()));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/adapter_capability.cpp", "Failed to verify mode")));
  Adapter::topology = WIFI_TOPOLOGY_CLIENT;  // a client record is not asked for its mode
  EXPECT_EQ(0, cap->Verify(Valid()));
  Json::Value j = utils::GetJsonValue(*cap);
  EXPECT_FALSE(j.isMember("mode"));
  EXPECT_FALSE(j.isMember("channel"));
  vorntest::Run({"/bin/mv", "/sbin/iwconfig.away", "/sbin/iwconfig"});
  vorntest::Run({"/bin/mv", "/sbin/iwlist.away", "/sbin/iwlist"});
}

TEST_F(Capability, GenericFixedAnswers) {
  Cap cap = Generic();
  EXPECT_EQ((std::vector<WIFI_TOPOLOGY>{WIFI_TOPOLOGY_CLIENT, WIFI_TOPOLOGY_BRIDGE,
                                        WIFI_TOPOLOGY_ROUTER}),
            cap->GetTopology());
  EXPECT_TRUE(cap->GetFeature().empty());
  EXPECT_EQ((std::vector<WIFI_BANDWIDTH>{WIFI_BANDWIDTH_20MHZ, WIFI_BANDWIDTH_20_40MHZ}),
            cap->GetBandwidth());
  EXPECT_EQ((std::vector<WIFI_POWER>{WIFI_POWER_HIGH, WIFI_POWER_MEDIUM, WIFI_POWER_LOW}),
            cap->GetPower());
  EXPECT_EQ(256u, cap->GetMaxNumClient());
  EXPECT_EQ(256u, cap->GetGuestNetworkMaxNumClient());
  EXPECT_EQ(8u, cap->GetSecurity().size());
  EXPECT_EQ(WIFI_SECURITY_DISABLED, cap->GetSecurity().front());
  EXPECT_EQ(WIFI_SECURITY_ENTERPRISE_WPA_MIXED, cap->GetSecurity().back());
  EXPECT_EQ(cap->GetSecurity(), cap->GetGuestNetworkSecurity());
  EXPECT_EQ((std::vector<WIFI_ENCRYPTION>{WIFI_ENCRYPTION_NONE, WIFI_ENCRYPTION_TKIP,
                                          WIFI_ENCRYPTION_AES, WIFI_ENCRYPTION_TKIP_AES}),
            cap->GetEncryption());
  EXPECT_EQ(cap->GetEncryption(), cap->GetGuestNetworkEncryption());
  EXPECT_EQ((std::vector<WIFI_MAC_FILTER_POLICY>{WIFI_MAC_FILTER_POLICY_DENY,
                                                 WIFI_MAC_FILTER_POLICY_ALLOW}),
            cap->GetMacFilterPolicy());
  Json::Value j = utils::GetJsonValue(*cap);
  EXPECT_EQ((std::vector<std::string>{"bandwidth", "channel", "encryption", "mac_filter_policy",
                                      "mode", "net_topology", "security", "tx_power"}),
            j.getMemberNames());  // no "feature": the getter is empty
  EXPECT_EQ("client", j["net_topology"][0].asString());
  EXPECT_EQ("high", j["tx_power"][0].asString());
  EXPECT_EQ(1u, j["channel"][0]["id"].asUInt());
  EXPECT_EQ("2.412", j["channel"][0]["frequency"].asString());
  EXPECT_EQ("bn", j["mode"][1].asString());
}

TEST_F(Capability, MaxClientsAtTheLimitPassAndOneMoreFails) {
  Cap cap = Generic();
  AdapterConfig c = Valid();
  c.max_num_client = 256;
  c.guest_max_num_client = 256;
  EXPECT_EQ(0, cap->Verify(c));
  SyslogCapture log;
  c.max_num_client = 257;
  EXPECT_EQ(-1, cap->Verify(c));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/adapter_capability.cpp",
                                           "Failed to verify max number client")));
  c.max_num_client = 256;
  c.guest_max_num_client = 257;
  EXPECT_EQ(-1, cap->Verify(c));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/adapter_capability.cpp",
                                           "Failed to verify guest max number client")));
}

TEST_F(Capability, TheChecksFailInTheirOrder) {
  Cap cap = Generic("wlan1");  // abgn: "a" is offered
  Json::Value s = Scenario();
  Json::Value fail;
  fail["args"].append("wlan1");
  fail["args"].append("scanning");
  fail["exit"] = 1;
  s["replies"]["iwlist"].append(fail);
  ASSERT_TRUE(vorntest::SetRadioScenario(s));

  AdapterConfig c = Valid("wlan1");
  c.mode = WIFI_MODE_BG;  // not offered by the generic class
  c.bandwidth = WIFI_BANDWIDTH_20_40_80MHZ;
  c.tx_power = WIFI_POWER_ERROR;
  c.security = WIFI_SECURITY_ERROR;
  c.encryption = WIFI_ENCRYPTION_ERROR;
  c.guest_security = WIFI_SECURITY_ERROR;
  c.guest_encryption = WIFI_ENCRYPTION_ERROR;
  c.max_num_client = 1000;
  c.guest_max_num_client = 1000;
  Adapter::topology = WIFI_TOPOLOGY_REPEATER;

  const std::vector<std::pair<const char*, std::function<void()>>> steps = {
      {"Failed to verify topology", [&] { Adapter::topology = WIFI_TOPOLOGY_ROUTER; }},
      {"Failed to verify mode", [&] { c.mode = WIFI_MODE_A; }},
      {"Failed to check and enable 5g mode for (wlan1)", [&] { c.mode = WIFI_MODE_G; }},
      {"Failed to verify bandwidth", [&] { c.bandwidth = WIFI_BANDWIDTH_20MHZ; }},
      {"Failed to verify power", [&] { c.tx_power = WIFI_POWER_LOW; }},
      {"Failed to verify security", [&] { c.security = WIFI_SECURITY_WEP; }},
      {"Failed to verify encryption", [&] { c.encryption = WIFI_ENCRYPTION_TKIP; }},
      {"Failed to verify guest security", [&] { c.guest_security = WIFI_SECURITY_WEP; }},
      {"Failed to verify guest encryption", [&] { c.guest_encryption = WIFI_ENCRYPTION_AES; }},
      {"Failed to verify max number client", [&] { c.max_num_client = 0; }},
      {"Failed to verify guest max number client", [&] { c.guest_max_num_client = 0; }},
  };
  for (const auto& step : steps) {
    SyslogCapture log;
    EXPECT_EQ(-1, cap->Verify(c)) << step.first;
    std::vector<vorntest::SyslogLine> lines;
    for (const auto& l : log.Lines()) {
      if (l.message.find("adapter_capability.cpp") != std::string::npos &&
          l.message.find("Failed to scan channels") == std::string::npos &&
          l.message.find("Failed to iwlist scanning") == std::string::npos) {
        lines.push_back(l);
      }
    }
    ASSERT_EQ(1u, lines.size()) << step.first << log.Dump();
    EXPECT_TRUE(std::regex_search(lines[0].message,
                                  std::regex(LogLine("wifi/adapter_capability.cpp", step.first))))
        << step.first << " / " << lines[0].message;
    step.second();
  }
  EXPECT_EQ(0, cap->Verify(c));
  // Neither the channel nor the MAC filter policy is checked.
  c.channel = 999;
  c.mac_filter_policy = WIFI_MAC_FILTER_POLICY_ERROR;
  EXPECT_EQ(0, cap->Verify(c));
}

TEST_F(Capability, FiveGigahertzModeOnADownLinkScansWithTheLinkUpAndLeavesItDown) {
  Cap cap = Generic("wlan1");
  ASSERT_FALSE(IsUp("wlan1"));
  AdapterConfig c = Valid("wlan1");
  for (WIFI_MODE mode : {WIFI_MODE_A, WIFI_MODE_AN}) {
    vorntest::ClearFakeJournal();
    c.mode = mode;
    EXPECT_EQ(0, cap->Verify(c));
    auto scans = vorntest::FakeCallsTo("/sbin/iwlist");
    ASSERT_EQ(1u, scans.size());
    EXPECT_EQ((std::vector<std::string>{"wlan1", "scanning"}), scans[0].argv);
    EXPECT_EQ("up", scans[0].env["link:wlan1"]);  // up while the radio scanned
    EXPECT_FALSE(IsUp("wlan1"));                  // and down again
  }
  // 2.4 GHz modes need no scan.
  vorntest::ClearFakeJournal();
  c.mode = WIFI_MODE_N;
  EXPECT_EQ(0, cap->Verify(c));
  EXPECT_TRUE(vorntest::FakeCallsTo("/sbin/iwlist").empty());
  // A client record is not asked for its mode, so no scan either.
  Adapter::topology = WIFI_TOPOLOGY_CLIENT;
  c.mode = WIFI_MODE_A;
  EXPECT_EQ(0, cap->Verify(c));
  EXPECT_TRUE(vorntest::FakeCallsTo("/sbin/iwlist").empty());
}

TEST_F(Capability, FiveGigahertzModeOnAnActiveLinkNeedsNoScan) {
  Cap cap = Generic("wlan1");
  IpOk({"link", "set", "rp-wlan1", "up"});
  IpOk({"link", "set", "wlan1", "up"});
  for (int i = 0; i < 50 && !utils::IsNetActivate("wlan1"); ++i) usleep(20000);
  ASSERT_TRUE(utils::IsNetActivate("wlan1"));
  AdapterConfig c = Valid("wlan1");
  c.mode = WIFI_MODE_AN;
  EXPECT_EQ(0, cap->Verify(c));
  EXPECT_TRUE(vorntest::FakeCallsTo("/sbin/iwlist").empty());
  EXPECT_TRUE(IsUp("wlan1"));
  IpOk({"link", "set", "wlan1", "down"});
  IpOk({"link", "set", "rp-wlan1", "down"});
}

TEST_F(Capability, FailedScanFailsTheCheckAndTheLinkStaysDown) {
  Cap cap = Generic("wlan1");
  Json::Value s = Scenario();
  Json::Value fail;
  fail["args"].append("wlan1");
  fail["args"].append("scanning");
  fail["stderr"] = "wlan1     Interface doesn't support scanning.\n";
  fail["exit"] = 255;
  s["replies"]["iwlist"].append(fail);
  ASSERT_TRUE(vorntest::SetRadioScenario(s));
  AdapterConfig c = Valid("wlan1");
  c.mode = WIFI_MODE_AN;
  SyslogCapture log;
  EXPECT_EQ(-1, cap->Verify(c));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/adapter_capability.cpp",
                                           "Failed to iwlist scanning for (wlan1)")));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/adapter_capability.cpp",
                                           "Failed to check and enable 5g mode for (wlan1)")));
  EXPECT_FALSE(IsUp("wlan1"));
}

TEST_F(Capability, FiveGigahertzModeOnAMissingInterfaceFails) {
  Json::Value s = Scenario();
  s["adapters"]["wlan9"] = vorntest::RadioAdapter("02:00:00:00:00:90", "a");
  ASSERT_TRUE(vorntest::SetRadioScenario(s));  // iwconfig knows it, the kernel does not
  Cap cap = Generic("wlan9");
  AdapterConfig c = Valid("wlan9");
  c.mode = WIFI_MODE_A;
  SyslogCapture log;
  EXPECT_EQ(-1, cap->Verify(c));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/adapter_capability.cpp",
                                           "Failed to interface up for (wlan9)")));
}

TEST_F(Capability, BuiltInRadiosGetTheirOwnClasses) {
  Cap generic = Generic();
  EXPECT_EQ(typeid(AdapterCapability), typeid(*generic));
  ASSERT_TRUE(vorntest::WriteFile("/usr/bin/get_key_value", "#!/bin/sh\necho vs_x86_713sky\n", 0755));
  Cap sky = Generic();
  EXPECT_EQ(typeid(AdapterCapabilitySkyModel), typeid(*sky));
  Json::Value s = Scenario();
  s["proc"]["pcie_wifi_ifname"] = "wlan0\n";
  ASSERT_TRUE(vorntest::SetRadioScenario(s));
  Cap rlt = Generic("wlan0");
  EXPECT_EQ(typeid(AdapterCapabilityRLT), typeid(*rlt));
  Cap other = Generic("wlan1");
  EXPECT_EQ(typeid(AdapterCapabilitySkyModel), typeid(*other));

  const std::vector<WIFI_FEATURE> all = {WIFI_FEATURE_MAC_FILTER, WIFI_FEATURE_GUEST_NETWORK,
                                         WIFI_FEATURE_PARENTAL_CONTROL,
                                         WIFI_FEATURE_CONNECTION_LIST};
  EXPECT_EQ(all, sky->GetFeature());
  EXPECT_EQ(all, rlt->GetFeature());
  AdapterConfig nonsense;  // every value "error"
  nonsense.max_num_client = 100000;
  EXPECT_EQ(0, sky->Verify(nonsense));
  EXPECT_EQ(0, rlt->Verify(nonsense));
  AdapterCapability::Delete(nullptr);
}

TEST_F(Capability, RltRadioHasFixedModesAndFortyTwoChannels) {
  AdapterConfig c = Valid();
  AdapterCapabilityRLT rlt("wlan0", &c);
  EXPECT_EQ((std::vector<WIFI_MODE>{WIFI_MODE_A, WIFI_MODE_B, WIFI_MODE_G, WIFI_MODE_N,
                                    WIFI_MODE_AN, WIFI_MODE_GN, WIFI_MODE_BG, WIFI_MODE_BGN,
                                    WIFI_MODE_AN_AC}),
            rlt.GetMode());
  EXPECT_EQ((std::vector<WIFI_BANDWIDTH>{WIFI_BANDWIDTH_20MHZ, WIFI_BANDWIDTH_20_40MHZ,
                                         WIFI_BANDWIDTH_20_40_80MHZ}),
            rlt.GetBandwidth());
  std::vector<AdapterCapability::Channel> ch = rlt.GetChannel();
  ASSERT_EQ(42u, ch.size());
  EXPECT_EQ(1u, ch.front().id);
  EXPECT_EQ("2.412GHz", ch.front().frequency);
  EXPECT_EQ(165u, ch.back().id);
  EXPECT_EQ("5.825GHz", ch.back().frequency);
  std::map<uint32_t, std::string> byId;
  for (const auto& x : ch) byId[x.id] = x.frequency;
  EXPECT_EQ("2.472GHz", byId[13]);
  EXPECT_EQ("2.484GHz", byId[14]);
  EXPECT_EQ("5.170GHz", byId[34]);
  EXPECT_EQ("5.240GHz", byId[48]);
  EXPECT_EQ("5.260GHz", byId[52]);
  EXPECT_EQ("5.320GHz", byId[64]);
  EXPECT_EQ("5.500GHz", byId[100]);
  EXPECT_EQ("5.700GHz", byId[140]);
  EXPECT_EQ("5.745GHz", byId[149]);
  EXPECT_EQ(0u, byId.count(36 + 1));
  for (std::size_t i = 1; i < ch.size(); ++i) EXPECT_LT(ch[i - 1].id, ch[i].id);
  EXPECT_TRUE(vorntest::FakeCallsTo("/sbin/iwlist").empty());  // nothing asked
  Json::Value j = utils::GetJsonValue(rlt);
  EXPECT_EQ(42u, j["channel"].size());
  EXPECT_EQ("an+ac", j["mode"][8].asString());
  EXPECT_EQ("connection_list", j["feature"][3].asString());
}
