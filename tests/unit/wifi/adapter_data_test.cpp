// The stored configuration of an adapter: factory defaults, the bytes of the files, the reload
// flags of a change, and stored files that cannot be read.
#include "vornwireless/wifi/adapter_data.h"

#include <sys/stat.h>

#include <gtest/gtest.h>

#include <functional>

#include "fixtures/fake_journal.h"
#include "fixtures/fake_radio.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "vornplatform/crypt.h"
#include "vornwireless/wifi/adapter.h"
#include "vornwireless/wifi/utils.h"

using namespace vornwireless::wifi;
using vorntest::LogLine;
using vorntest::ReadFile;
using vorntest::SyslogCapture;
using vorntest::WriteFile;

namespace {

const char kAp[] = "/usr/vorn/etc/wifi/wifi_ap_02:00:00:00:00:10";
const char kClient[] = "/usr/vorn/etc/wifi/wifi_client_02:00:00:00:00:10";

Json::Value Scenario(const std::string& standards) {
  Json::Value s;
  s["adapters"]["wlan0"] = vorntest::RadioAdapter("02:00:00:00:00:10", standards);
  return s;
}

std::string Encrypt(const std::string& plain) {
  std::string out;
  EXPECT_EQ(0, utils::EncryptPlainText(plain, out));
  return out;
}

std::string Decrypt(const std::string& cipher) {
  std::string out;
  EXPECT_EQ(0, utils::DecryptCipherText(cipher, out)) << cipher;
  return out;
}

// The value of "\tkey=" in a stored text.
std::string StoredValue(const std::string& text, const std::string& key) {
  std::size_t at = text.find("\t" + key + "=");
  if (at == std::string::npos) return "<absent>";
  at += key.size() + 2;
  return text.substr(at, text.find('\n', at) - at);
}

std::string Replace(std::string text, const std::string& from, const std::string& to) {
  std::size_t at = text.find(from);
  if (at != std::string::npos) text.replace(at, from.size(), to);
  return text;
}

struct DataDeleter {
  void operator()(AdapterData* d) const { AdapterData::Delete(d); }
};
typedef std::unique_ptr<AdapterData, DataDeleter> Data;

class AdapterDataTest : public ::testing::Test {
 protected:
  static void SetUpTestSuite() {
    ASSERT_TRUE(vorntest::InSandbox());
    std::string why;
    ASSERT_TRUE(vorntest::InstallRadio(Scenario("bgn"), &why)) << why;
  }
  void SetUp() override {
    vorntest::Run({"/bin/rm", "-rf", "/usr/vorn/etc/wifi", "/etc/hostapd/mac_filter"});
    vorntest::Run({"/bin/mkdir", "-p", "/usr/vorn/etc/wifi", "/etc/hostapd/mac_filter"});
    ASSERT_TRUE(vorntest::SetRadioScenario(Scenario("bgn")));
    Adapter::topology = WIFI_TOPOLOGY_ROUTER;
  }
  void TearDown() override { Adapter::topology = WIFI_TOPOLOGY_ERROR; }

  static Data Make() { return Data(AdapterData::Create("wlan0")); }

  // A full access point record for wlan0.
  static AdapterConfig Full(const AdapterConfig& base) {
    AdapterConfig c = base;
    c.enabled = true;
    c.ssid = "My Cupboard";
    c.display_ssid = false;
    c.mode = WIFI_MODE_BGN;
    c.bandwidth = WIFI_BANDWIDTH_20MHZ;
    c.channel = 6;
    c.tx_power = WIFI_POWER_MEDIUM;
    c.max_num_client = 32;
    c.wmm_enabled = false;
    c.schedule_enabled = true;
    for (unsigned i = 0; i < 168; ++i) c.schedule[i] = i % 24 >= 8;
    c.CountryCode = "DE";
    c.CountryRegion = 1;
    c.CountryRegionABand = 2;
    c.security = WIFI_SECURITY_PERSONAL_WPA2;
    c.encryption = WIFI_ENCRYPTION_AES;
    c.password = "correct horse battery";
    c.auth_server_ip = std::string("10.0.0.2");
    c.auth_server_Port = 1812;
    c.auth_server_shared_secret = "radius secret";
    c.guest_support = true;
    c.guest_enabled = true;
    c.guest_ssid = "Guests";
    c.guest_display_ssid = true;
    c.guest_max_num_client = 8;
    c.guest_security = WIFI_SECURITY_PERSONAL_WPA;
    c.guest_encryption = WIFI_ENCRYPTION_TKIP;
    c.guest_password = "guest pw";
    c.guest_allow_access_guest = true;
    c.guest_allow_access_lan = false;
    c.guest_allow_access_http_https_only = true;
    c.guest_schedule_enabled = false;
    c.mac_filter_policy = WIFI_MAC_FILTER_POLICY_ALLOW;
    AdapterConfig::MacFilterRule r1, r2;
    r1.enabled = true;
    r1.mac = std::string("02:00:00:00:02:01");
    r1.desc = "laptop";
    r2.enabled = false;
    r2.mac = std::string("02:00:00:00:02:02");
    r2.desc = "tv = living";
    c.mac_filter_list = {r1, r2};
    return c;
  }
};

}  // namespace

TEST_F(AdapterDataTest, FactoryDefaultsWithoutAFile) {
  Data d = Make();
  ASSERT_TRUE(d);
  const AdapterConfig& c = d->GetConfig();
  EXPECT_EQ("wlan0", c.interface);
  EXPECT_EQ("02:00:00:00:00:10", c.bssid.ToString());
  EXPECT_EQ(WIFI_DRIVER_NL80211, c.driver);
  EXPECT_TRUE(c.enabled);
  EXPECT_EQ("NetCupboard", c.ssid);
  EXPECT_TRUE(c.display_ssid);
  EXPECT_EQ(WIFI_MODE_N, c.mode);  // iwconfig says 802.11bgn
  EXPECT_EQ(WIFI_BANDWIDTH_20_40MHZ, c.bandwidth);
  EXPECT_EQ(0u, c.channel);
  EXPECT_EQ(WIFI_POWER_HIGH, c.tx_power);
  EXPECT_EQ(256u, c.max_num_client);
  EXPECT_TRUE(c.wmm_enabled);
  EXPECT_FALSE(c.schedule_enabled);
  EXPECT_EQ("", c.CountryCode);
  EXPECT_EQ(5, c.CountryRegion);
  EXPECT_EQ(7, c.CountryRegionABand);
  EXPECT_EQ(std::string(168, '0'), utils::rgbltoa(c.schedule, 168));
  EXPECT_EQ(WIFI_SECURITY_DISABLED, c.security);  // a new adapter comes up open
  EXPECT_EQ(WIFI_ENCRYPTION_AES, c.encryption);
  EXPECT_EQ("", c.password);
  EXPECT_FALSE(c.guest_support);  // not a wireless model
  EXPECT_FALSE(c.guest_enabled);
  EXPECT_EQ("NetCupboardGuest", c.guest_ssid);
  EXPECT_TRUE(c.guest_display_ssid);
  EXPECT_EQ("02:00:00:00:00:11", c.guest_bssid.ToString());
  EXPECT_EQ(256u, c.guest_max_num_client);
  EXPECT_EQ(WIFI_SECURITY_DISABLED, c.guest_security);
  EXPECT_EQ(WIFI_ENCRYPTION_AES, c.guest_encryption);
  EXPECT_FALSE(c.guest_allow_access_guest);
  EXPECT_FALSE(c.guest_allow_access_lan);
  EXPECT_FALSE(c.guest_allow_access_http_https_only);
  EXPECT_FALSE(c.guest_schedule_enabled);
  EXPECT_EQ(WIFI_MAC_FILTER_POLICY_DENY, c.mac_filter_policy);
  EXPECT_TRUE(c.mac_filter_list.empty());
  EXPECT_FALSE(c.is_pci_interface);
  EXPECT_FALSE(c.clientenabled);  // no client file
  EXPECT_TRUE(c.station_list.empty());
  RELOAD_STATUS s = d->GetReloadStatus();
  EXPECT_TRUE(s.blConfig && s.blPower && s.blSchedule && s.blGuestSchedule && s.blGuestRule);
  EXPECT_FALSE(d->NeedReload());
  // iwconfig was asked about the adapter.
  auto calls = vorntest::FakeCallsTo("/sbin/iwconfig");
  ASSERT_FALSE(calls.empty());
  EXPECT_EQ(std::vector<std::string>{"wlan0"}, calls.back().argv);
}

TEST_F(AdapterDataTest, DefaultModeFollowsTheStandardsIwconfigReports) {
  const std::vector<std::pair<std::string, WIFI_MODE>> cases = {
      {"bgn", WIFI_MODE_N}, {"an", WIFI_MODE_N}, {"bg", WIFI_MODE_G}, {"g", WIFI_MODE_G},
      {"b", WIFI_MODE_B},   {"a", WIFI_MODE_GN}, {"", WIFI_MODE_GN}};
  for (const auto& c : cases) {
    ASSERT_TRUE(vorntest::SetRadioScenario(Scenario(c.first)));
    Data d = Make();
    ASSERT_TRUE(d);
    EXPECT_EQ(c.second, d->GetConfig().mode) << c.first;
  }
}

TEST_F(AdapterDataTest, DefaultModeIsGnWithoutIwconfig) {
  ASSERT_EQ(0, vorntest::Run({"/bin/mv", "/sbin/iwconfig", "/sbin/iwconfig.away"}).status);
  SyslogCapture log;
  Data d = Make();
  vorntest::Run({"/bin/mv", "/sbin/iwconfig.away", "/sbin/iwconfig"});
  ASSERT_TRUE(d);
  EXPECT_EQ(WIFI_MODE_GN, d->GetConfig().mode);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/adapter_data.cpp",
                                           "Failed to get iwconfig (iwconfig), set default mode to gn")))
      << log.Dump();
}

TEST_F(AdapterDataTest, ApFileByteForByteAndPasswordsDecipherBack) {
  Data d = Make();
  ASSERT_TRUE(d);
  AdapterConfig c = Full(d->GetConfig());
  ASSERT_EQ(0, d->SetConfig(c));
  ASSERT_EQ(0, d->Write());

  const std::string text = ReadFile(kAp);
  const std::string password = StoredValue(text, "password");
  const std::string guestPassword = StoredValue(text, "guest_password");
  EXPECT_EQ("correct horse battery", Decrypt(password));
  EXPECT_EQ("guest pw", Decrypt(guestPassword));
  EXPECT_EQ(std::string::npos, text.find("correct horse"));
  std::string schedule;
  for (int day = 0; day < 7; ++day) schedule += std::string(8, '0') + std::string(16, '1');
  const std::string expected =
      "[general]\n"
      "\tbssid=02:00:00:00:00:10\n"
      "\tdriver=nl80211\n"
      "\tenabled=yes\n"
      "\tssid=My Cupboard\n"
      "\tdisplay_ssid=no\n"
      "\tmode=bgn\n"
      "\tbandwidth=20MHZ\n"
      "\tchannel=6\n"
      "\ttx_power=medium\n"
      "\tmax_num_client=32\n"
      "\twmm_enabled=no\n"
      "\tschedule_enabled=yes\n"
      "\tis_pci_interface=no\n"
      "\tCountryCode=DE\n"
      "\tCountryRegion=1\n"
      "\tCountryRegionABand=2\n"
      "\tschedule=" + schedule + "\n"
      "\tsecurity=PERSONAL_WPA2\n"
      "\tencryption=AES\n"
      "\tpassword=" + password + "\n"
      "\tauth_server_ip=10.0.0.2\n"
      "\tauth_server_Port=1812\n"
      "\tauth_server_shared_secret=radius secret\n"
      "\tguest_support=yes\n"
      "\tguest_enabled=yes\n"
      "\tguest_ssid=Guests\n"
      "\tguest_display_ssid=yes\n"
      "\tguest_bssid=02:00:00:00:00:11\n"
      "\tguest_max_num_client=8\n"
      "\tguest_security=PERSONAL_WPA\n"
      "\tguest_encryption=TKIP\n"
      "\tguest_password=" + guestPassword + "\n"
      "\tguest_allow_access_guest=yes\n"
      "\tguest_allow_access_lan=no\n"
      "\tguest_allow_access_http_https_only=yes\n"
      "\tguest_schedule_enabled=no\n"
      "\tguest_schedule=" + std::string(168, '0') + "\n"
      "\tmac_filter_policy=allow\n";
  EXPECT_EQ(expected, text);

  EXPECT_EQ("policy=allow\n", ReadFile("/etc/hostapd/mac_filter/mf.info"));
  EXPECT_EQ(
      "[0]\n\tenable=yes\n\tdesc=laptop\n\tmac=02:00:00:00:02:01\n"
      "[1]\n\tenable=no\n\tdesc=tv = living\n\tmac=02:00:00:00:02:02\n",
      ReadFile("/etc/hostapd/mac_filter/mf.conf"));
  EXPECT_FALSE(vorntest::Exists(kClient));

  // Read back: the same record.
  Data again = Make();
  ASSERT_TRUE(again);
  EXPECT_EQ(utils::ToStyledText(utils::GetJsonValue(c)),
            utils::ToStyledText(utils::GetJsonValue(again->GetConfig())));

  // A second write replaces the section in place.
  c.ssid = "Second";
  c.mac_filter_list.pop_back();
  ASSERT_EQ(0, d->SetConfig(c));
  ASSERT_EQ(0, d->Write());
  const std::string second = ReadFile(kAp);
  EXPECT_EQ("Second", StoredValue(second, "ssid"));
  EXPECT_EQ(0u, second.find("[general]\n"));
  EXPECT_EQ(std::string::npos, second.find('[', 1));
  EXPECT_EQ("[0]\n\tenable=yes\n\tdesc=laptop\n\tmac=02:00:00:00:02:01\n",
            ReadFile("/etc/hostapd/mac_filter/mf.conf"));
}

TEST_F(AdapterDataTest, WriteMakesTheDirectoriesItWritesInto) {
  vorntest::Run({"/bin/rm", "-rf", "/usr/vorn/etc", "/etc/hostapd"});
  Data d = Make();
  ASSERT_TRUE(d);
  ASSERT_EQ(0, d->Write());
  EXPECT_TRUE(vorntest::Exists(kAp));
  struct stat st;
  ASSERT_EQ(0, stat("/usr/vorn/etc/wifi", &st));
  EXPECT_EQ(0755u, st.st_mode & 07777);
  EXPECT_EQ("policy=deny\n", ReadFile("/etc/hostapd/mac_filter/mf.info"));
  EXPECT_FALSE(vorntest::Exists("/etc/hostapd/mac_filter/mf.conf"));  // no rule
}

TEST_F(AdapterDataTest, ClientFileInClientTopology) {
  Adapter::topology = WIFI_TOPOLOGY_CLIENT;
  Data d = Make();
  ASSERT_TRUE(d);
  AdapterConfig c = d->GetConfig();
  c.clientenabled = true;
  AdapterConfig::StationInfo s;
  s.essid = "Home";
  s.bssid = std::string("02:00:00:00:01:01");
  s.opmode = WIFI_OPMODE_MANAGED;
  s.security = WIFI_SECURITY_PERSONAL_WPA2;
  s.encryption = WIFI_ENCRYPTION_AES;
  s.password = "home pw";
  s.access_time = 1700000000;
  s.is_dhcp = true;
  s.channel = 11;
  s.signal = 80;
  s.hwmode = WIFI_MODE_BGN;
  c.station_list = {s};
  ASSERT_EQ(0, d->SetConfig(c));
  ASSERT_EQ(0, d->Write());
  EXPECT_FALSE(vorntest::Exists(kAp));
  const std::string text = ReadFile(kClient);
  const std::string cipher = StoredValue(text, "password");
  EXPECT_EQ("home pw", Decrypt(cipher));
  EXPECT_EQ(
      "[general]\n\tclientenabled=yes\n"
      "[02:00:00:00:01:01]\n\tessid=Home\n\tbssid=02:00:00:00:01:01\n\topmode=Any\n"
      "\tsecurity=PERSONAL_WPA2\n\tencryption=AES\n\tuser=\n\tpassword=" + cipher + "\n"
      "\taccess_time=1700000000\n\tis_dhcp=yes\n\tip=\n\tnetmask=\n\tgateway=\n\tchannel=11\n"
      "\thwmode=bgn\n",
      text);
  Data again = Make();
  ASSERT_TRUE(again);
  EXPECT_TRUE(again->GetConfig().clientenabled);
  ASSERT_EQ(1u, again->GetConfig().station_list.size());
  const AdapterConfig::StationInfo& r = again->GetConfig().station_list[0];
  EXPECT_EQ("home pw", r.password);
  EXPECT_EQ(WIFI_OPMODE_MANAGED, r.opmode);
  EXPECT_EQ(11, r.channel);
  EXPECT_EQ(0, r.signal);  // not stored
  EXPECT_EQ(1700000000u, r.access_time);
}

TEST_F(AdapterDataTest, EachRowOfTheFlagTableRaisesExactlyItsFlags) {
  struct Row {
    const char* name;
    std::function<void(AdapterConfig&)> change;
    RELOAD_STATUS want;
  };
  auto F = [](bool config, bool power, bool schedule, bool guestSchedule, bool guestRule) {
    RELOAD_STATUS s;
    s.blConfig = config;
    s.blPower = power;
    s.blSchedule = schedule;
    s.blGuestSchedule = guestSchedule;
    s.blGuestRule = guestRule;
    return s;
  };
  const RELOAD_STATUS config = F(true, false, false, false, false);
  const std::vector<Row> rows = {
      {"enabled", [](AdapterConfig& c) { c.enabled = !c.enabled; }, F(true, false, false, false, true)},
      {"ssid", [](AdapterConfig& c) { c.ssid = "x"; }, config},
      {"display_ssid", [](AdapterConfig& c) { c.display_ssid = !c.display_ssid; }, config},
      {"mode", [](AdapterConfig& c) { c.mode = WIFI_MODE_A; }, config},
      {"bandwidth", [](AdapterConfig& c) { c.bandwidth = WIFI_BANDWIDTH_20MHZ; }, config},
      {"channel", [](AdapterConfig& c) { c.channel = 3; }, config},
      {"wmm_enabled", [](AdapterConfig& c) { c.wmm_enabled = !c.wmm_enabled; }, config},
      {"CountryCode", [](AdapterConfig& c) { c.CountryCode = "US"; }, config},
      {"CountryRegion", [](AdapterConfig& c) { c.CountryRegion = 0; }, config},
      {"CountryRegionABand", [](AdapterConfig& c) { c.CountryRegionABand = 0; }, config},
      {"schedule_enabled", [](AdapterConfig& c) { c.schedule_enabled = true; }, F(false, false, true, false, false)},
      {"schedule cell", [](AdapterConfig& c) { c.schedule[167] = true; }, F(false, false, true, false, false)},
      {"security", [](AdapterConfig& c) { c.security = WIFI_SECURITY_WEP; }, config},
      {"encryption", [](AdapterConfig& c) { c.encryption = WIFI_ENCRYPTION_TKIP; }, config},
      {"password", [](AdapterConfig& c) { c.password = "pw"; }, config},
      {"auth_server_ip", [](AdapterConfig& c) { c.auth_server_ip = std::string("1.2.3.4"); }, config},
      {"auth_server_Port", [](AdapterConfig& c) { c.auth_server_Port = 1; }, config},
      {"auth_server_shared_secret", [](AdapterConfig& c) { c.auth_server_shared_secret = "s"; }, config},
      {"guest_support", [](AdapterConfig& c) { c.guest_support = !c.guest_support; }, config},
      {"guest_enabled", [](AdapterConfig& c) { c.guest_enabled = true; }, F(true, false, false, false, true)},
      {"guest_ssid", [](AdapterConfig& c) { c.guest_ssid = "g"; }, config},
      {"guest_display_ssid", [](AdapterConfig& c) { c.guest_display_ssid = false; }, config},
      {"guest_max_num_client", [](AdapterConfig& c) { c.guest_max_num_client = 1; }, config},
      {"guest_security", [](AdapterConfig& c) { c.guest_security = WIFI_SECURITY_WEP; }, config},
      {"guest_encryption", [](AdapterConfig& c) { c.guest_encryption = WIFI_ENCRYPTION_NONE; }, config},
      {"guest_password", [](AdapterConfig& c) { c.guest_password = "gp"; }, config},
      {"guest_allow_access_guest", [](AdapterConfig& c) { c.guest_allow_access_guest = true; }, config},
      {"guest_allow_access_lan", [](AdapterConfig& c) { c.guest_allow_access_lan = true; }, F(false, false, false, false, true)},
      {"guest_allow_access_http_https_only", [](AdapterConfig& c) { c.guest_allow_access_http_https_only = true; }, F(false, false, false, false, true)},
      {"guest_schedule_enabled", [](AdapterConfig& c) { c.guest_schedule_enabled = true; }, F(false, false, false, true, false)},
      {"mac_filter_policy", [](AdapterConfig& c) { c.mac_filter_policy = WIFI_MAC_FILTER_POLICY_ALLOW; }, config},
      {"mac_filter_list", [](AdapterConfig& c) { c.mac_filter_list.resize(1); }, config},
      {"tx_power", [](AdapterConfig& c) { c.tx_power = WIFI_POWER_LOW; }, F(false, true, false, false, false)},
      {"guest_schedule cell", [](AdapterConfig& c) { c.guest_schedule[3] = true; }, F(false, false, false, false, false)},
      {"max_num_client", [](AdapterConfig& c) { c.max_num_client = 1; }, F(false, false, false, false, false)},
  };
  Data d = Make();
  ASSERT_TRUE(d);
  for (const Row& row : rows) {
    AdapterConfig c = d->GetConfig();
    row.change(c);
    d->ResetReloadStatus();
    ASSERT_EQ(0, d->SetConfig(c)) << row.name;
    RELOAD_STATUS s = d->GetReloadStatus();
    EXPECT_EQ(row.want.blConfig, s.blConfig) << row.name;
    EXPECT_EQ(row.want.blPower, s.blPower) << row.name;
    EXPECT_EQ(row.want.blSchedule, s.blSchedule) << row.name;
    EXPECT_EQ(row.want.blGuestSchedule, s.blGuestSchedule) << row.name;
    EXPECT_EQ(row.want.blGuestRule, s.blGuestRule) << row.name;
    // The incoming record is held afterwards.
    EXPECT_EQ(utils::ToStyledText(utils::GetJsonValue(c)),
              utils::ToStyledText(utils::GetJsonValue(d->GetConfig())))
        << row.name;
  }
  // A mac rule that differs in one member counts as a change.
  AdapterConfig c = d->GetConfig();
  c.mac_filter_list[0].desc = "other";
  d->ResetReloadStatus();
  d->SetConfig(c);
  EXPECT_TRUE(d->GetReloadStatus().blConfig);
}

TEST_F(AdapterDataTest, FlagsOnlyRiseExceptTheScheduleFlagWhichFollowsTheLastChange) {
  Data d = Make();
  ASSERT_TRUE(d);
  d->ResetReloadStatus();
  AdapterConfig c = d->GetConfig();
  c.tx_power = WIFI_POWER_LOW;
  d->SetConfig(c);
  c.ssid = "other";
  d->SetConfig(c);
  EXPECT_TRUE(d->GetReloadStatus().blPower);
  EXPECT_TRUE(d->GetReloadStatus().blConfig);

  d->EnableReloadStatus();
  c = d->GetConfig();
  c.ssid = "third";
  d->SetConfig(c);
  RELOAD_STATUS s = d->GetReloadStatus();
  EXPECT_TRUE(s.blConfig && s.blPower && s.blGuestSchedule && s.blGuestRule);
  EXPECT_FALSE(s.blSchedule);  // assigned from this change's schedule switch
  EXPECT_EQ(0, d->ResetReloadStatus());
  s = d->GetReloadStatus();
  EXPECT_FALSE(s.blConfig || s.blPower || s.blSchedule || s.blGuestSchedule || s.blGuestRule);
}

TEST_F(AdapterDataTest, SetConfigWithTheHeldRecordItselfDoesNothing) {
  Data d = Make();
  ASSERT_TRUE(d);
  d->ResetReloadStatus();
  EXPECT_EQ(0, d->SetConfig(d->GetConfig()));
  EXPECT_FALSE(d->GetReloadStatus().blConfig);
}

TEST_F(AdapterDataTest, GuestScheduleAloneRaisesNoFlag) {
  Data d = Make();
  ASSERT_TRUE(d);
  d->ResetReloadStatus();
  AdapterConfig c = d->GetConfig();
  std::fill(c.guest_schedule, c.guest_schedule + 168, true);
  ASSERT_EQ(0, d->SetConfig(c));
  RELOAD_STATUS s = d->GetReloadStatus();
  EXPECT_FALSE(s.blConfig || s.blPower || s.blSchedule || s.blGuestSchedule || s.blGuestRule);
  EXPECT_TRUE(d->GetConfig().guest_schedule[100]);
}

TEST_F(AdapterDataTest, ClientTopologyWithoutStationsLogsAndTakesTheIncomingRecord) {
  Adapter::topology = WIFI_TOPOLOGY_CLIENT;
  Data d = Make();
  ASSERT_TRUE(d);
  AdapterConfig c = d->GetConfig();
  AdapterConfig::StationInfo s;
  s.bssid = std::string("02:00:00:00:01:01");
  c.station_list = {s};
  ASSERT_EQ(0, d->SetConfig(c));
  ASSERT_EQ(1u, d->GetConfig().station_list.size());
  c.station_list.clear();
  c.ssid = "incoming";
  SyslogCapture log;
  EXPECT_EQ(0, d->SetConfig(c));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/adapter_data.cpp", "stationList is null")))
      << log.Dump();
  EXPECT_TRUE(d->GetConfig().station_list.empty());
  EXPECT_EQ("incoming", d->GetConfig().ssid);
  d->ResetReloadStatus();
  c.ssid = "again";
  d->SetConfig(c);
  EXPECT_FALSE(d->GetReloadStatus().blConfig);  // no flag in client topology
}

TEST_F(AdapterDataTest, SetConfigInAnUnknownTopologyFails) {
  Data d = Make();
  ASSERT_TRUE(d);
  Adapter::topology = WIFI_TOPOLOGY_REPEATER;
  AdapterConfig c = d->GetConfig();
  c.ssid = "new";
  SyslogCapture log;
  EXPECT_EQ(-1, d->SetConfig(c));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/adapter_data.cpp", "Bad topology [4]")));
  EXPECT_EQ("NetCupboard", d->GetConfig().ssid);
}

TEST_F(AdapterDataTest, WriteInRepeaterTopologyWritesNothing) {
  Data d = Make();
  ASSERT_TRUE(d);
  Adapter::topology = WIFI_TOPOLOGY_REPEATER;
  EXPECT_EQ(0, d->Write());
  EXPECT_FALSE(vorntest::Exists(kAp));
  EXPECT_FALSE(vorntest::Exists(kClient));
  EXPECT_FALSE(vorntest::Exists("/etc/hostapd/mac_filter/mf.info"));
}

TEST_F(AdapterDataTest, ApFileWithoutSecurityKeysReadsAsWpa2Aes) {
  ASSERT_TRUE(WriteFile(kAp, "[general]\n\tenabled=no\n\tdisplay_ssid=yes\n\twmm_enabled=yes\n"
                             "\tschedule_enabled=no\n\tis_pci_interface=no\n\tpassword=" +
                                 Encrypt("pw") + "\n\tguest_password=" + Encrypt("") + "\n"));
  Data d = Make();
  ASSERT_TRUE(d);
  const AdapterConfig& c = d->GetConfig();
  EXPECT_EQ(WIFI_SECURITY_PERSONAL_WPA2, c.security);
  EXPECT_EQ(WIFI_ENCRYPTION_AES, c.encryption);
  EXPECT_EQ(WIFI_SECURITY_PERSONAL_WPA2, c.guest_security);
  EXPECT_EQ("pw", c.password);
  EXPECT_EQ("", c.guest_password);
  EXPECT_FALSE(c.enabled);
  EXPECT_EQ("NetCupboard", c.ssid);
  EXPECT_EQ(WIFI_MODE_N, c.mode);  // by iwconfig
  EXPECT_EQ(WIFI_BANDWIDTH_20_40MHZ, c.bandwidth);
  EXPECT_EQ(WIFI_POWER_HIGH, c.tx_power);
  EXPECT_EQ(256u, c.max_num_client);
  EXPECT_EQ(5, c.CountryRegion);
  EXPECT_EQ(7, c.CountryRegionABand);
  EXPECT_EQ("NetCupboardGuest", c.guest_ssid);
  EXPECT_EQ("02:00:00:00:00:11", c.guest_bssid.ToString());
  EXPECT_EQ(WIFI_MAC_FILTER_POLICY_DENY, c.mac_filter_policy);
}

TEST_F(AdapterDataTest, UnreadableApFileGivesAnOpenAccessPointAndClientOff) {
  // A directory at the file's place: readable for access(), but no section in it.
  ASSERT_EQ(0, vorntest::Run({"/bin/mkdir", "-p", kAp}).status);
  SyslogCapture log;
  EXPECT_FALSE(Make());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/adapter_data.cpp", "Failed to get AP value")));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/adapter_data.cpp", "Failed to get Config value")));
  vorntest::Run({"/bin/rmdir", kAp});
  // No file at all: the factory's open access point.
  Data d = Make();
  ASSERT_TRUE(d);
  EXPECT_TRUE(d->GetConfig().enabled);
  EXPECT_EQ("NetCupboard", d->GetConfig().ssid);
  EXPECT_EQ(0u, d->GetConfig().channel);
  EXPECT_EQ(WIFI_SECURITY_DISABLED, d->GetConfig().security);
  EXPECT_FALSE(d->GetConfig().clientenabled);
}

TEST_F(AdapterDataTest, UndecipherablePasswordFailsTheReadAndKeepsTheOldRecord) {
  Data d = Make();
  ASSERT_TRUE(d);
  ASSERT_EQ(0, d->Write());
  const std::string good = ReadFile(kAp);
  ASSERT_TRUE(WriteFile(kAp, Replace(good, "\tpassword=" + StoredValue(good, "password"),
                                     "\tpassword=not-a-cipher-text")));
  SyslogCapture log;
  EXPECT_FALSE(Make());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/utils.cpp", "VLIBCCryptSzDecrypt failed")));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/adapter_data.cpp", "Failed to decrypt cipher text")));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/adapter_data.cpp", "Failed to get Config value")));
  AdapterConfig before = d->GetConfig();
  EXPECT_EQ(-1, d->Read());
  EXPECT_EQ(utils::ToStyledText(utils::GetJsonValue(before)),
            utils::ToStyledText(utils::GetJsonValue(d->GetConfig())));
}

TEST_F(AdapterDataTest, StoredScheduleOfWrongLengthFailsTheRead) {
  Data d = Make();
  ASSERT_TRUE(d);
  ASSERT_EQ(0, d->Write());
  const std::string good = ReadFile(kAp);
  ASSERT_TRUE(WriteFile(kAp, Replace(good, "\tschedule=" + std::string(168, '0'),
                                     "\tschedule=" + std::string(100, '0'))));
  EXPECT_FALSE(Make());
}

TEST_F(AdapterDataTest, ClientFileWithoutGeneralLeavesTheClientSideOn) {
  ASSERT_TRUE(WriteFile(kClient, "[02:00:00:00:01:01]\n\tessid=Home\n\tbssid=02:00:00:00:01:01\n"
                                 "\topmode=Managed\n\tpassword=" + Encrypt("x") +
                                     "\n[02:00:00:00:01:02]\n"));
  Data d = Make();
  ASSERT_TRUE(d);
  EXPECT_TRUE(d->GetConfig().clientenabled);
  ASSERT_EQ(1u, d->GetConfig().station_list.size());  // the empty section is skipped
  EXPECT_EQ("Home", d->GetConfig().station_list[0].essid);
  EXPECT_EQ(0, d->GetConfig().station_list[0].channel);  // absent channel
  ASSERT_TRUE(WriteFile(kClient, "[general]\n\tclientenabled=no\n"));
  Data off = Make();
  ASSERT_TRUE(off);
  EXPECT_FALSE(off->GetConfig().clientenabled);
}

TEST_F(AdapterDataTest, ObsoleteClientFileReplacesTheAddressedOne) {
  ASSERT_TRUE(WriteFile(kClient, "[general]\n\tclientenabled=no\n"));
  ASSERT_TRUE(WriteFile("/usr/vorn/etc/wifi/wifi_client_obsolete",
                        "[general]\n\tclientenabled=yes\n"));
  Data d = Make();
  ASSERT_TRUE(d);
  EXPECT_TRUE(d->GetConfig().clientenabled);
  EXPECT_FALSE(vorntest::Exists("/usr/vorn/etc/wifi/wifi_client_obsolete"));
  EXPECT_EQ("[general]\n\tclientenabled=yes\n", ReadFile(kClient));
}

TEST_F(AdapterDataTest, MacFilterRulesAreReadInFileOrder) {
  ASSERT_TRUE(WriteFile("/etc/hostapd/mac_filter/mf.conf",
                        "[0]\n\tenable=yes\n\tdesc=a\n\tmac=02:00:00:00:02:01\n"
                        "[1]\n\tenable=no\n\tdesc=b\n\tmac=02:00:00:00:02:02\n"));
  Data d = Make();
  ASSERT_TRUE(d);
  ASSERT_EQ(2u, d->GetConfig().mac_filter_list.size());
  EXPECT_TRUE(d->GetConfig().mac_filter_list[0].enabled);
  EXPECT_EQ("b", d->GetConfig().mac_filter_list[1].desc);
  ASSERT_TRUE(WriteFile("/etc/hostapd/mac_filter/mf.conf", "[0]\n"));
  SyslogCapture log;
  EXPECT_FALSE(Make());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/adapter_data.cpp", "Failed to get MacFilter value")));
}

TEST_F(AdapterDataTest, AnAdapterWithoutAddressCannotBeMade) {
  SyslogCapture log;
  EXPECT_EQ(nullptr, AdapterData::Create("wlan9"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/adapter_data.cpp", "Failed to get BSSID[wlan9]")));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/utils.cpp",
                                           "Failed to open [/sys/class/net/wlan9/address]")));
}

TEST_F(AdapterDataTest, BadTextsNeverTearAStoredFile) {
  Data d = Make();
  ASSERT_TRUE(d);
  AdapterConfig c = Full(d->GetConfig());
  ASSERT_EQ(0, d->SetConfig(c));
  ASSERT_EQ(0, d->Write());
  const std::string ap = ReadFile(kAp);
  const std::string mf = ReadFile("/etc/hostapd/mac_filter/mf.conf");

  // A line break cannot be stored: the write fails (Write still answers 0), the files stay.
  for (const char* bad : {"two\nlines", "carriage\rreturn"}) {
    AdapterConfig b = c;
    b.ssid = bad;
    ASSERT_EQ(0, d->SetConfig(b));
    EXPECT_EQ(0, d->Write());
    EXPECT_EQ(ap, ReadFile(kAp));
    b = c;
    b.mac_filter_list[1].desc = bad;
    ASSERT_EQ(0, d->SetConfig(b));
    EXPECT_EQ(0, d->Write());
    EXPECT_EQ(mf, ReadFile("/etc/hostapd/mac_filter/mf.conf"));
  }
  EXPECT_FALSE(vorntest::Exists("/etc/hostapd/mac_filter/mf.conf.new"));

  // Quotes, "=", 33+ bytes and bytes that are not UTF-8 are stored and read back as they are.
  for (const std::string& odd :
       {std::string("a=b \"c\" ="), std::string(40, 'x'), std::string("\xff\xfe raw"),
        std::string("'single'"), std::string("#hash [x]"), std::string("\"quoted\""),
        std::string("  blanks around  ")}) {
    AdapterConfig b = c;
    b.ssid = odd;
    b.password = odd;
    ASSERT_EQ(0, d->SetConfig(b));
    ASSERT_EQ(0, d->Write());
    Data again = Make();
    ASSERT_TRUE(again) << odd;
    EXPECT_EQ(odd, again->GetConfig().ssid);
    EXPECT_EQ(odd, again->GetConfig().password);
  }

  // A record whose own address is no MAC never names a file.
  AdapterConfig b = c;
  b.bssid = std::string("../../../etc/passwd");
  b.ssid = "elsewhere";
  ASSERT_EQ(0, d->SetConfig(b));
  SyslogCapture log;
  EXPECT_EQ(0, d->Write());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/adapter_data.cpp",
                                           "Bad mac address [../../../etc/passwd]")));
  EXPECT_FALSE(vorntest::Exists("/usr/vorn/etc/wifi/wifi_ap_../../../etc/passwd"));
  EXPECT_EQ(std::string::npos, ReadFile("/etc/passwd").find("elsewhere"));
}

TEST_F(AdapterDataTest, PasswordTooLongToEncipherStopsTheWriteBeforeAnyFile) {
  Data d = Make();
  ASSERT_TRUE(d);
  ASSERT_EQ(0, d->Write());
  const std::string ap = ReadFile(kAp);
  AdapterConfig c = d->GetConfig();
  c.password = std::string(VLIBC_CRYPT_PLAIN_MAX + 1, 'p');
  c.mac_filter_policy = WIFI_MAC_FILTER_POLICY_ALLOW;
  ASSERT_EQ(0, d->SetConfig(c));
  SyslogCapture log;
  EXPECT_EQ(0, d->Write());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/adapter_data.cpp", "Failed to Encrypt plain text")));
  EXPECT_EQ(ap, ReadFile(kAp));
  EXPECT_EQ("policy=deny\n", ReadFile("/etc/hostapd/mac_filter/mf.info"));
}
