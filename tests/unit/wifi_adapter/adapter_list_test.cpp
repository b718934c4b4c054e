// The adapter list against the fake radio's veth "wlan" links: enumeration within the model's
// limit, the keys it writes, add/remove, the change path (check, store, agent, flags) with a
// recording agent, schedules, on/off and the lookups.
#include "vornwireless/wifi/adapter.h"

#include <gtest/gtest.h>

#include <ctime>

#include "fixtures/fake_journal.h"
#include "fixtures/fake_radio.h"
#include "recording_agent.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "vornwireless/wifi/adapter_agent.h"

using namespace vornwireless::wifi;
using vorntest::AgentCall;
using vorntest::LogLine;
using vorntest::ReadFile;
using vorntest::RecordingAgent;
using vorntest::SyslogCapture;
using vorntest::WriteFile;

namespace {

const char kFile[] = "wifi/adapter.cpp";
const char kDefaults[] = "/etc.defaults/vorninfo.conf";
const char kInfo[] = "/etc/vorninfo.conf";
const char kAp0[] = "/usr/vorn/etc/wifi/wifi_ap_02:00:00:00:00:10";

Json::Value Scenario() {
  Json::Value s;
  s["adapters"]["wlan0"] = vorntest::RadioAdapter("02:00:00:00:00:10", "bgn");
  s["adapters"]["wlan1"] = vorntest::RadioAdapter("02:00:00:00:00:20", "bgn");
  s["adapters"]["wlan2"] = vorntest::RadioAdapter("02:00:00:00:00:30", "bgn");
  return s;
}

// The value of key in a key file ("key=value" or key="value"), "<absent>" without it.
std::string KeyOf(const std::string& path, const std::string& key) {
  const std::string text = ReadFile(path);
  std::size_t at = 0;
  while (at < text.size()) {
    std::size_t end = text.find('\n', at);
    if (end == std::string::npos) end = text.size();
    const std::string line = text.substr(at, end - at);
    if (line.compare(0, key.size() + 1, key + "=") == 0) {
      std::string v = line.substr(key.size() + 1);
      if (v.size() >= 2 && v.front() == '"' && v.back() == '"') v = v.substr(1, v.size() - 2);
      return v;
    }
    at = end + 1;
  }
  return "<absent>";
}

std::string StoredValue(const std::string& text, const std::string& key) {
  std::size_t at = text.find("\t" + key + "=");
  if (at == std::string::npos) return "<absent>";
  at += key.size() + 2;
  return text.substr(at, text.find('\n', at) - at);
}

std::vector<std::string> Names() {
  std::vector<std::string> out;
  for (const Adapter& a : Adapter::GetList()) out.push_back(a.GetConfig().interface);
  return out;
}

class AdapterList : public ::testing::Test {
 protected:
  static void SetUpTestSuite() {
    ASSERT_TRUE(vorntest::InSandbox());
    std::string why;
    ASSERT_TRUE(vorntest::InstallRadio(Scenario(), &why)) << why;
  }
  void SetUp() override {
    // Links a test removed come back.
    std::string why;
    ASSERT_TRUE(vorntest::InstallRadio(Scenario(), &why)) << why;
    vorntest::Run({"/bin/rm", "-rf", "/usr/vorn/etc/wifi", "/etc/hostapd/mac_filter"});
    vorntest::Run({"/bin/mkdir", "-p", "/usr/vorn/etc/wifi", "/etc/hostapd/mac_filter",
                   "/etc.defaults"});
    vorntest::Run({"/bin/sh", "-c", "rm -f /tmp/wireless.info*"});
    ASSERT_TRUE(WriteFile(kDefaults, "support_wireless_number=\"2\"\n"));
    ASSERT_TRUE(WriteFile(kInfo, "net_topology=\"router\"\n"));
    RecordingAgent::Reset();
    previous_ = AdapterAgent::SetMaker(&RecordingAgent::Make);
    Adapter::topology = WIFI_TOPOLOGY_ERROR;
  }
  void TearDown() override {
    Adapter::DeleteAdapterAll();
    AdapterAgent::SetMaker(previous_);
    Adapter::topology = WIFI_TOPOLOGY_ERROR;
  }
  AdapterAgent::Maker previous_ = nullptr;
};

// ---- enumeration and the list ----------------------------------------------------------------

TEST_F(AdapterList, RefreshListsTheWlanLinksBelowTheLimitAndAppliesEachOnce) {
  EXPECT_EQ(1, Adapter::RefreshAdapterList());
  EXPECT_EQ((std::vector<std::string>{"wlan0", "wlan1"}), Names());  // wlan2 is beyond 2
  EXPECT_EQ("yes", KeyOf(kInfo, "support_net_topology"));
  EXPECT_EQ("no", KeyOf(kInfo, "has_wifi_dongle"));
  EXPECT_EQ(WIFI_TOPOLOGY_ROUTER, Adapter::GetTopology());  // read on the first Create
  // Each new adapter is applied with its own record, every flag raised.
  std::vector<AgentCall> reloads = RecordingAgent::CallsOf("Reload");
  ASSERT_EQ(2u, reloads.size());
  EXPECT_EQ("wlan0", reloads[0].ifname);
  EXPECT_EQ("wlan1", reloads[1].ifname);
  EXPECT_TRUE(reloads[0].status.blConfig);
  EXPECT_TRUE(reloads[0].status.blPower);
  EXPECT_TRUE(reloads[0].status.blGuestRule);
  // The schedule flag is assigned from the (unchanged) switch, not kept from creation.
  EXPECT_FALSE(reloads[0].status.blSchedule);
  EXPECT_TRUE(vorntest::Exists(kAp0));
  // Nothing new: unchanged, no agent work.
  RecordingAgent::calls.clear();
  EXPECT_EQ(0, Adapter::RefreshAdapterList());
  EXPECT_EQ(2u, Adapter::GetList().size());
  EXPECT_TRUE(RecordingAgent::calls.empty());
}

TEST_F(AdapterList, WithoutTheLimitKeyEveryWlanLinkIsAnAdapterWithOneLineEachRefresh) {
  ASSERT_TRUE(WriteFile(kDefaults, "model=\"x\"\n"));
  const std::string line =
      LogLine(kFile, "Cannot find key [support_wireless_number] in file "
                     "[/etc.defaults/vorninfo.conf], skip setting limit for adapter number");
  SyslogCapture log;
  EXPECT_EQ(1, Adapter::RefreshAdapterList());
  EXPECT_EQ((std::vector<std::string>{"wlan0", "wlan1", "wlan2"}), Names());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, line)) << log.Dump();
  log.Clear();
  EXPECT_EQ(0, Adapter::RefreshAdapterList());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, line)) << log.Dump();
}

TEST_F(AdapterList, MissingDefaultsFileMeansNoLimit) {
  vorntest::Run({"/bin/rm", "-f", kDefaults});
  EXPECT_EQ(1, Adapter::RefreshAdapterList());
  EXPECT_EQ(3u, Adapter::GetList().size());
}

TEST_F(AdapterList, LimitZeroGivesNoAdapterAndNoTopologySupport) {
  ASSERT_TRUE(WriteFile(kDefaults, "support_wireless_number=\"0\"\n"));
  EXPECT_EQ(0, Adapter::RefreshAdapterList());
  EXPECT_TRUE(Adapter::GetList().empty());
  EXPECT_EQ("no", KeyOf(kInfo, "support_net_topology"));
  EXPECT_EQ(0, RecordingAgent::made);
}

TEST_F(AdapterList, LimitOneKeepsWlan0AndLimitThousandKeepsAll) {
  ASSERT_TRUE(WriteFile(kDefaults, "support_wireless_number=\"1\"\n"));
  EXPECT_EQ(1, Adapter::RefreshAdapterList());
  EXPECT_EQ(std::vector<std::string>{"wlan0"}, Names());
  ASSERT_TRUE(WriteFile(kDefaults, "support_wireless_number=\"1000\"\n"));
  EXPECT_EQ(1, Adapter::RefreshAdapterList());
  EXPECT_EQ((std::vector<std::string>{"wlan0", "wlan1", "wlan2"}), Names());
}

TEST_F(AdapterList, ALimitThatIsNoNumberFailsTheRefreshAndWritesNothing) {
  ASSERT_TRUE(WriteFile(kDefaults, "support_wireless_number=\"two\"\n"));
  SyslogCapture log;
  EXPECT_EQ(-1, Adapter::RefreshAdapterList());
  EXPECT_TRUE(Adapter::GetList().empty());
  EXPECT_EQ("<absent>", KeyOf(kInfo, "support_net_topology"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to strtol string [two]"))) << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to enum wlan"))) << log.Dump();
}

TEST_F(AdapterList, AWlanLinkThatGoesAwayIsTerminatedAndRemoved) {
  ASSERT_EQ(1, Adapter::RefreshAdapterList());
  vorntest::IpOk({"link", "del", "wlan1"});
  RecordingAgent::calls.clear();
  EXPECT_EQ(1, Adapter::RefreshAdapterList());
  EXPECT_EQ(std::vector<std::string>{"wlan0"}, Names());
  std::vector<AgentCall> disables = RecordingAgent::CallsOf("Disable");
  ASSERT_EQ(1u, disables.size());
  EXPECT_EQ("wlan1", disables[0].ifname);
}

TEST_F(AdapterList, OfTwoGoneNeighboursTheSecondGoesOnTheNextRefresh) {
  ASSERT_TRUE(WriteFile(kDefaults, "support_wireless_number=\"3\"\n"));
  ASSERT_EQ(1, Adapter::RefreshAdapterList());
  vorntest::IpOk({"link", "del", "wlan1"});
  vorntest::IpOk({"link", "del", "wlan2"});
  EXPECT_EQ(1, Adapter::RefreshAdapterList());
  EXPECT_EQ((std::vector<std::string>{"wlan0", "wlan2"}), Names());
  EXPECT_EQ(1, Adapter::RefreshAdapterList());
  EXPECT_EQ(std::vector<std::string>{"wlan0"}, Names());
}

TEST_F(AdapterList, ADongleInfoFileIsCountedAndNoted) {
  ASSERT_TRUE(WriteFile("/tmp/wireless.info", "x\n"));
  EXPECT_EQ(1, Adapter::GetDongleCount());
  ASSERT_TRUE(WriteFile("/tmp/wireless.info.2", "x\n"));
  EXPECT_EQ(2, Adapter::GetDongleCount());
  Adapter::RefreshAdapterList();
  EXPECT_EQ("yes", KeyOf(kInfo, "has_wifi_dongle"));
}

TEST_F(AdapterList, ANewAdapterWhoseAgentFailsToStartIsStillListed) {
  RecordingAgent::results["Reload"] = -1;
  SyslogCapture log;
  EXPECT_EQ(0, Adapter::AddAdapter("wlan0"));
  EXPECT_EQ(std::vector<std::string>{"wlan0"}, Names());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to apply new config"))) << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR,
                          LogLine(kFile, "Failed to apply agent(wlan0) when created, skip it")))
      << log.Dump();
}

TEST_F(AdapterList, WithoutAnAgentNoAdapterIsMade) {
  EXPECT_EQ(nullptr, previous_);  // the library alone registers no agent kind
  AdapterAgent::SetMaker(nullptr);
  SyslogCapture log;
  EXPECT_EQ(-1, Adapter::AddAdapter("wlan0"));
  EXPECT_TRUE(Adapter::GetList().empty());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to create agent(wlan0)"))) << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to add adapter(wlan0)"))) << log.Dump();
  EXPECT_EQ(nullptr, Adapter::Create("wlan1"));
}

TEST_F(AdapterList, CreateFailsWhenTheTopologyCannotBeRead) {
  vorntest::Run({"/bin/rm", "-f", kInfo});
  vorntest::Run({"/bin/mkdir", "-p", kInfo});  // unreadable as a key file
  SyslogCapture log;
  EXPECT_EQ(nullptr, Adapter::Create("wlan0"));
  vorntest::Run({"/bin/rmdir", kInfo});
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to read topology from vorninfo.conf")))
      << log.Dump();
  EXPECT_EQ(0, RecordingAgent::made);
}

TEST_F(AdapterList, AddingTwiceAndRemovingAnUnknownAdapterFail) {
  ASSERT_EQ(0, Adapter::AddAdapter("wlan0"));
  SyslogCapture log;
  EXPECT_EQ(-1, Adapter::AddAdapter("wlan0"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "[wlan0] had been added"))) << log.Dump();
  EXPECT_EQ(-1, Adapter::RemoveAdapter("wlan9"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to find adapter(wlan9)"))) << log.Dump();
  EXPECT_EQ(1u, Adapter::GetList().size());
}

TEST_F(AdapterList, RemoveTerminatesEvenWhenTheAgentFails) {
  ASSERT_EQ(0, Adapter::AddAdapter("wlan0"));
  RecordingAgent::results["Disable"] = -1;
  EXPECT_EQ(0, Adapter::RemoveAdapter("wlan0"));
  EXPECT_TRUE(Adapter::GetList().empty());
  EXPECT_EQ(1u, RecordingAgent::CallsOf("Disable").size());
}

TEST_F(AdapterList, LookupsByNameAndByBssid) {
  ASSERT_EQ(1, Adapter::RefreshAdapterList());
  ASSERT_NE(nullptr, Adapter::GetAdapter("wlan1"));
  EXPECT_EQ("wlan1", Adapter::GetAdapter("wlan1")->GetConfig().interface);
  EXPECT_EQ(nullptr, Adapter::GetAdapter("wlan2"));
  auto it = Adapter::FindAdapter(MacAddress("02:00:00:00:00:20"));
  ASSERT_TRUE(it != Adapter::GetList().end());
  EXPECT_EQ("wlan1", it->GetConfig().interface);
  EXPECT_TRUE(Adapter::FindAdapter(MacAddress("02:00:00:00:00:99")) == Adapter::GetList().end());
  EXPECT_EQ("02:00:00:00:00:10", Adapter::GetAddressByIFName("wlan0").ToString());
  SyslogCapture log;
  EXPECT_EQ("", Adapter::GetAddressByIFName("wlan7").ToString());
  EXPECT_TRUE(log.HasOnce(LOG_ERR,
                          LogLine(kFile, "Failed to open file [/sys/class/net/wlan7/address]")))
      << log.Dump();
}

TEST_F(AdapterList, DeleteAllDisablesEveryAgentAndEmptiesTheList) {
  ASSERT_EQ(1, Adapter::RefreshAdapterList());
  RecordingAgent::calls.clear();
  EXPECT_EQ(0, Adapter::DeleteAdapterAll());
  EXPECT_TRUE(Adapter::GetList().empty());
  std::vector<AgentCall> d = RecordingAgent::CallsOf("Disable");
  ASSERT_EQ(2u, d.size());
  EXPECT_EQ("wlan0", d[0].ifname);
  EXPECT_EQ("wlan1", d[1].ifname);
}

// ---- the change path -------------------------------------------------------------------------

TEST_F(AdapterList, ApplyStoresHandsTheFlagsToTheAgentAndClearsThem) {
  ASSERT_EQ(0, Adapter::AddAdapter("wlan0"));
  Adapter* a = Adapter::GetAdapter("wlan0");
  RecordingAgent::calls.clear();
  AdapterConfig c = a->GetConfig();
  c.ssid = "Attic";
  EXPECT_EQ(0, a->Apply(c));
  std::vector<AgentCall> r = RecordingAgent::CallsOf("Reload");
  ASSERT_EQ(1u, r.size());
  EXPECT_EQ("Attic", r[0].config.ssid);
  EXPECT_TRUE(r[0].status.blConfig);
  EXPECT_FALSE(r[0].status.blPower);
  EXPECT_FALSE(r[0].status.blSchedule);
  EXPECT_EQ("Attic", StoredValue(ReadFile(kAp0), "ssid"));
  EXPECT_EQ("Attic", a->GetConfig().ssid);
  // The same record again: the flags were cleared, the agent is told nothing changed.
  EXPECT_EQ(0, a->Apply(c));
  r = RecordingAgent::CallsOf("Reload");
  ASSERT_EQ(2u, r.size());
  EXPECT_FALSE(r[1].status.blConfig);
}

TEST_F(AdapterList, ARecordTheRadioCannotDoChangesNothing) {
  ASSERT_EQ(0, Adapter::AddAdapter("wlan0"));
  Adapter* a = Adapter::GetAdapter("wlan0");
  const std::string before = ReadFile(kAp0);
  RecordingAgent::calls.clear();
  AdapterConfig c = a->GetConfig();
  c.ssid = "Attic";
  c.mode = WIFI_MODE_A;  // a b/g/n radio
  SyslogCapture log;
  EXPECT_EQ(-1, a->Apply(c));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Bad config"))) << log.Dump();
  EXPECT_TRUE(RecordingAgent::calls.empty());
  EXPECT_EQ(before, ReadFile(kAp0));
  EXPECT_NE("Attic", a->GetConfig().ssid);
}

TEST_F(AdapterList, AFailingAgentKeepsTheNewRecordAndItsFlagsForTheNextApply) {
  ASSERT_EQ(0, Adapter::AddAdapter("wlan0"));
  Adapter* a = Adapter::GetAdapter("wlan0");
  AdapterConfig c = a->GetConfig();
  c.ssid = "Attic";
  RecordingAgent::results["Reload"] = -1;
  SyslogCapture log;
  EXPECT_EQ(-1, a->Apply(c));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to apply new config"))) << log.Dump();
  EXPECT_EQ("Attic", StoredValue(ReadFile(kAp0), "ssid"));
  EXPECT_EQ("Attic", a->GetConfig().ssid);
  RecordingAgent::results.clear();
  RecordingAgent::calls.clear();
  EXPECT_EQ(0, a->Apply(c));  // nothing new in the record, yet the reload is still owed
  std::vector<AgentCall> r = RecordingAgent::CallsOf("Reload");
  ASSERT_EQ(1u, r.size());
  EXPECT_TRUE(r[0].status.blConfig);
}

// The whole change runs under the Wi-Fi mutex, the agent's reload included, and the mutex is free
// again on every path; removal stops the agent before it takes the mutex.
TEST_F(AdapterList, TheWifiMutexIsHeldWhileTheAgentReloads) {
  ASSERT_EQ(0, Adapter::AddAdapter("wlan0"));
  Adapter* a = Adapter::GetAdapter("wlan0");
  std::vector<AgentCall> r = RecordingAgent::CallsOf("Reload");
  ASSERT_EQ(1u, r.size());
  EXPECT_TRUE(r[0].mutexHeld);
  AdapterConfig c = a->GetConfig();
  c.mode = WIFI_MODE_A;
  EXPECT_EQ(-1, a->Apply(c));
  ASSERT_EQ(0, pthread_mutex_trylock(&Adapter::_wifiMutex));
  pthread_mutex_unlock(&Adapter::_wifiMutex);
  RecordingAgent::results["Reload"] = -1;
  c = a->GetConfig();
  c.ssid = "Locked";
  EXPECT_EQ(-1, a->Apply(c));
  ASSERT_EQ(0, pthread_mutex_trylock(&Adapter::_wifiMutex));
  pthread_mutex_unlock(&Adapter::_wifiMutex);
  EXPECT_EQ(0, Adapter::RemoveAdapter("wlan0"));
  std::vector<AgentCall> d = RecordingAgent::CallsOf("Disable");
  ASSERT_EQ(1u, d.size());
  EXPECT_FALSE(d[0].mutexHeld);
}

// ---- schedules ---------------------------------------------------------------------------------

TEST_F(AdapterList, AScheduleCellEqualToTheStateAppliesNothing) {
  ASSERT_EQ(0, Adapter::AddAdapter("wlan0"));
  Adapter* a = Adapter::GetAdapter("wlan0");
  AdapterConfig c = a->GetConfig();
  c.enabled = true;
  c.schedule_enabled = true;
  for (bool& cell : c.schedule) cell = true;  // on every hour
  ASSERT_EQ(0, a->Apply(c));
  const std::string stored = ReadFile(kAp0);
  RecordingAgent::calls.clear();
  EXPECT_EQ(0, a->ExecSchedule());
  EXPECT_TRUE(RecordingAgent::calls.empty());
  EXPECT_EQ(stored, ReadFile(kAp0));
}

TEST_F(AdapterList, AScheduleCellThatDiffersSwitchesTheRadioThroughApply) {
  ASSERT_EQ(0, Adapter::AddAdapter("wlan0"));
  Adapter* a = Adapter::GetAdapter("wlan0");
  AdapterConfig c = a->GetConfig();
  c.enabled = true;
  c.schedule_enabled = true;
  for (bool& cell : c.schedule) cell = false;  // off every hour
  ASSERT_EQ(0, a->Apply(c));
  RecordingAgent::calls.clear();
  EXPECT_EQ(0, a->ExecSchedule());
  std::vector<AgentCall> r = RecordingAgent::CallsOf("Reload");
  ASSERT_EQ(1u, r.size());
  EXPECT_FALSE(r[0].config.enabled);
  EXPECT_FALSE(a->GetConfig().enabled);
  EXPECT_EQ("no", StoredValue(ReadFile(kAp0), "enabled"));
}

TEST_F(AdapterList, TheGuestScheduleSwitchesTheGuestNetworkOnly) {
  ASSERT_EQ(0, Adapter::AddAdapter("wlan0"));
  Adapter* a = Adapter::GetAdapter("wlan0");
  AdapterConfig c = a->GetConfig();
  c.enabled = true;
  c.guest_enabled = false;
  c.guest_schedule_enabled = true;
  for (bool& cell : c.guest_schedule) cell = true;
  for (bool& cell : c.schedule) cell = false;  // not enabled: ignored
  ASSERT_EQ(0, a->Apply(c));
  RecordingAgent::calls.clear();
  EXPECT_EQ(0, a->ExecSchedule());
  std::vector<AgentCall> r = RecordingAgent::CallsOf("Reload");
  ASSERT_EQ(1u, r.size());
  EXPECT_TRUE(r[0].config.guest_enabled);
  EXPECT_TRUE(r[0].config.enabled);
}

TEST_F(AdapterList, AScheduleRunsOnlyWhenEnabledAndInRouterOrBridge) {
  ASSERT_EQ(0, Adapter::AddAdapter("wlan0"));
  Adapter* a = Adapter::GetAdapter("wlan0");
  SyslogCapture log;
  EXPECT_EQ(-1, a->ExecSchedule());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Adapter [wlan0]'s schedule is not enabled, "
                                                  "but still executed")))
      << log.Dump();
  Adapter::topology = WIFI_TOPOLOGY_CLIENT;
  EXPECT_EQ(-1, a->ExecSchedule());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Schedule function should only execute in "
                                                  "router or bridge mode")))
      << log.Dump();
  EXPECT_TRUE(RecordingAgent::CallsOf("Reload").size() == 1u);  // only the one of AddAdapter
}

// ---- on/off ------------------------------------------------------------------------------------

TEST_F(AdapterList, EnableAllOnAnEmptyListFails) {
  EXPECT_EQ(-1, Adapter::EnableAll());
  EXPECT_EQ(-1, Adapter::DisableAll());
}

TEST_F(AdapterList, EnableAndDisableAllSwitchCopiesAndKeepTheRecords) {
  ASSERT_EQ(1, Adapter::RefreshAdapterList());
  AdapterConfig c = Adapter::GetAdapter("wlan0")->GetConfig();
  c.enabled = false;
  c.clientenabled = false;
  ASSERT_EQ(0, Adapter::GetAdapter("wlan0")->Apply(c));
  RecordingAgent::calls.clear();
  RecordingAgent::results["Enable"] = -1;  // a failure goes on to the next adapter
  SyslogCapture log;
  EXPECT_EQ(0, Adapter::EnableAll());
  std::vector<AgentCall> e = RecordingAgent::CallsOf("Enable");
  ASSERT_EQ(2u, e.size());
  EXPECT_TRUE(e[0].config.enabled);
  EXPECT_TRUE(e[0].config.clientenabled);
  EXPECT_EQ(2u, log.Matching("Failed to initialize").size());
  EXPECT_FALSE(Adapter::GetAdapter("wlan0")->GetConfig().enabled);
  EXPECT_EQ("no", StoredValue(ReadFile(kAp0), "enabled"));
  EXPECT_EQ(0, Adapter::DisableAll());
  std::vector<AgentCall> d = RecordingAgent::CallsOf("Disable");
  ASSERT_EQ(2u, d.size());
  EXPECT_FALSE(d[1].config.enabled);
}

TEST_F(AdapterList, TheWifiButtonDoesNothingWithoutABuiltInRadio) {
  ASSERT_EQ(1, Adapter::RefreshAdapterList());
  RecordingAgent::calls.clear();
  EXPECT_EQ(nullptr, Adapter::GetPCIAdapter());
  EXPECT_EQ(0, Adapter::SwitchOnOff());
  EXPECT_TRUE(RecordingAgent::calls.empty());
}

TEST_F(AdapterList, EnabledAndEnablingAdaptersAreCounted) {
  ASSERT_EQ(1, Adapter::RefreshAdapterList());
  RecordingAgent::status = WIFI_STATUS_DISABLED;
  EXPECT_EQ(0, Adapter::GetEnabledAdapterCount());
  RecordingAgent::status = WIFI_STATUS_ENABLING;
  EXPECT_EQ(2, Adapter::GetEnabledAdapterCount());
  RecordingAgent::status = WIFI_STATUS_ENABLED;
  EXPECT_EQ(2, Adapter::GetEnabledAdapterCount());
  EXPECT_EQ(WIFI_STATUS_ENABLED, Adapter::GetAdapter("wlan0")->GetStatus());
}

TEST_F(AdapterList, MembersForwardToTheAgentWithTheHeldRecord) {
  ASSERT_EQ(0, Adapter::AddAdapter("wlan0"));
  Adapter* a = Adapter::GetAdapter("wlan0");
  RecordingAgent::calls.clear();
  EXPECT_EQ(0, a->Initialize());
  EXPECT_EQ(0, a->Terminate());
  std::vector<AdapterConfig::StationInfo> st;
  EXPECT_EQ(0, a->ScanNetworks(st));
  std::vector<utils::ConnectionInfo> conn;
  EXPECT_EQ(0, a->LoadStationConnData(conn));
  EXPECT_EQ(0, a->EnableWPSWithPBC());
  EXPECT_EQ(0, a->EnableWPSWithPinCode("12345670"));
  EXPECT_TRUE(a->SetCountryCodeImpl("DE"));
  EXPECT_EQ(0, a->SwitchTopology(WIFI_TOPOLOGY_BRIDGE));
  std::vector<std::string> ops;
  for (const AgentCall& call : RecordingAgent::calls) ops.push_back(call.op);
  EXPECT_EQ((std::vector<std::string>{"Recover", "Disable", "ScanNetworks", "LoadStationConnData",
                                      "EnableWPSWithPBC", "EnableWPSWithPinCode"}),
            ops);
  EXPECT_EQ("wlan0", RecordingAgent::calls[0].config.interface);
  EXPECT_TRUE(a->IsTopology(WIFI_TOPOLOGY_ROUTER));
  EXPECT_FALSE(a->HasNullMember());
}

TEST_F(AdapterList, AddAgentAllGivesEveryAdapterAFreshRecoveredAgent) {
  ASSERT_EQ(1, Adapter::RefreshAdapterList());
  RecordingAgent::calls.clear();
  const int before = RecordingAgent::made;
  // The old agents are gone in the state this is meant for; here they are replaced.
  EXPECT_EQ(0, Adapter::AddAgentAll());
  EXPECT_EQ(before + 2, RecordingAgent::made);
  std::vector<AgentCall> r = RecordingAgent::CallsOf("Recover");
  ASSERT_EQ(2u, r.size());
  EXPECT_EQ("wlan0", r[0].ifname);
}

}  // namespace
