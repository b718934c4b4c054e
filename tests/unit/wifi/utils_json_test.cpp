// JSON forms of the Wi-Fi records: the text a default record gives, stable round trips, and
// documents that fail whole without changing the record.
#include <gtest/gtest.h>

#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "vornwireless/wifi/utils.h"

using namespace vornwireless::wifi;
using vorntest::LogLine;
using vorntest::SyslogCapture;

namespace {

std::string Golden(const std::string& name) {
  return vorntest::ReadFile(std::string(VORN_WIFI_GOLDEN) + "/" + name);
}

// A document every member of which reads without a log line.
Json::Value Clean() {
  Json::Value v;
  v["driver"] = "nl80211";
  v["mode"] = "gn";
  v["bandwidth"] = "20MHZ";
  v["tx_power"] = "high";
  v["security"] = "disabled";
  v["encryption"] = "AES";
  v["guest_security"] = "disabled";
  v["guest_encryption"] = "AES";
  v["mac_filter_policy"] = "deny";
  return v;
}

std::string Text(const Json::Value& v) { return v.toStyledString(); }

// Lines at LOG_ERR or worse (address values note their shape at LOG_DEBUG).
std::vector<vorntest::SyslogLine> Errors(SyslogCapture& log) {
  std::vector<vorntest::SyslogLine> out;
  for (const auto& l : log.Lines()) {
    if (l.level <= LOG_ERR) out.push_back(l);
  }
  return out;
}

// "Failed to parse config" with the reason behind it.
std::string ParseFailure() { return "^wifi/utils_json\\.cpp:[0-9]+ Failed to parse config \\(.+\\)$"; }

}  // namespace

TEST(WifiJson, DefaultRecordGivesTheGoldenText) {
  const std::string golden = Golden("default_adapter_config.json");
  ASSERT_FALSE(golden.empty());
  EXPECT_EQ(golden, utils::ToStyledText(utils::GetJsonValue(AdapterConfig())));
}

TEST(WifiJson, FullRecordRoundTripIsStable) {
  const std::string golden = Golden("full_adapter_config.json");
  ASSERT_FALSE(golden.empty());
  AdapterConfig c;
  SyslogCapture log;
  ASSERT_EQ(0, utils::GetConfig(golden, c));
  EXPECT_TRUE(Errors(log).empty()) << log.Dump();
  EXPECT_EQ(golden, utils::ToStyledText(utils::GetJsonValue(c)));
  // The values as the record holds them.
  EXPECT_EQ("wlan0", c.interface);
  EXPECT_EQ(WIFI_MODE_BGN, c.mode);
  EXPECT_EQ(11u, c.channel);
  EXPECT_EQ(-3, c.CountryRegion);
  EXPECT_TRUE(c.schedule[0]);
  EXPECT_TRUE(c.schedule[7]);
  EXPECT_FALSE(c.schedule[8]);
  EXPECT_TRUE(c.schedule[6 * 24 + 7]);
  EXPECT_FALSE(c.guest_schedule[17]);
  EXPECT_TRUE(c.guest_schedule[18]);
  ASSERT_EQ(2u, c.mac_filter_list.size());
  EXPECT_EQ("tv = \"living\"", c.mac_filter_list[1].desc);
  ASSERT_EQ(2u, c.station_list.size());
  EXPECT_EQ(WIFI_OPMODE_MANAGED, c.station_list[0].opmode);
  EXPECT_EQ(4294967295u, c.station_list[1].access_time);
  EXPECT_EQ(-1, c.station_list[1].channel);
  EXPECT_EQ("192.168.5.1", c.station_list[1].gateway.ToString());
  EXPECT_FALSE(c.clientenabled);
}

TEST(WifiJson, MissingClientEnabledLeavesTheClientSideOn) {
  Json::Value v = Clean();
  AdapterConfig c;
  ASSERT_EQ(0, utils::GetConfig(Text(v), c));
  EXPECT_TRUE(c.clientenabled);
  v["clientenabled"] = false;
  ASSERT_EQ(0, utils::GetConfig(Text(v), c));
  EXPECT_FALSE(c.clientenabled);
  v["clientenabled"] = true;
  ASSERT_EQ(0, utils::GetConfig(Text(v), c));
  EXPECT_TRUE(c.clientenabled);
}

TEST(WifiJson, AbsentMembersReadAsEmptyAndAbsentEnumsAsErrorWithALogLine) {
  AdapterConfig c;
  c.ssid = "old";
  c.channel = 6;
  SyslogCapture log;
  ASSERT_EQ(0, utils::GetConfig("{}", c));
  EXPECT_EQ("", c.ssid);
  EXPECT_EQ(0u, c.channel);
  EXPECT_EQ(WIFI_DRIVER_ERROR, c.driver);
  EXPECT_EQ(WIFI_MODE_ERROR, c.mode);
  // driver, mode, bandwidth, tx_power, security, encryption, guest_security, guest_encryption,
  // mac_filter_policy: nine enumerations, each with its line.
  EXPECT_EQ(9u, log.Matching(LogLine("wifi/enum.cpp", "Failed to find key()")).size()) << log.Dump();
}

TEST(WifiJson, ScheduleOfWrongLengthFailsTheWholeConversion) {
  AdapterConfig c;
  c.ssid = "kept";
  Json::Value v = Clean();
  v["ssid"] = "changed";
  v["schedule"] = std::string(167, '1');
  SyslogCapture log;
  EXPECT_EQ(-1, utils::GetConfig(Text(v), c));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/utils_json.cpp",
                                           "Failed to set [" + std::string(167, '1') +
                                               "] to scheduler")))
      << log.Dump();
  EXPECT_EQ("kept", c.ssid);  // nothing of the document was applied
  EXPECT_FALSE(c.schedule[0]);

  v["schedule"] = std::string(169, '1');
  EXPECT_EQ(-1, utils::GetConfig(Text(v), c));
  v["schedule"] = "";
  EXPECT_EQ(-1, utils::GetConfig(Text(v), c));
  v["schedule"] = std::string(168, '1');
  v["guest_schedule"] = std::string(10, '1');
  EXPECT_EQ(-1, utils::GetConfig(Text(v), c));
  EXPECT_EQ("kept", c.ssid);
  EXPECT_FALSE(c.schedule[0]);
}

TEST(WifiJson, ScheduleCharactersOtherThanOneGiveFalseCells) {
  std::string text(168, 'x');
  text[0] = '1';
  text[1] = '0';
  text[2] = 'I';
  text[167] = '1';
  text[100] = '\xc3';
  Json::Value v = Clean();
  v["schedule"] = text;
  v["guest_schedule"] = std::string(168, '1');
  AdapterConfig c;
  ASSERT_EQ(0, utils::GetConfig(Text(v), c));
  EXPECT_TRUE(c.schedule[0]);
  EXPECT_FALSE(c.schedule[1]);
  EXPECT_FALSE(c.schedule[2]);
  EXPECT_FALSE(c.schedule[100]);
  EXPECT_TRUE(c.schedule[167]);
  EXPECT_EQ("1" + std::string(166, '0') + "1", utils::rgbltoa(c.schedule, 168));
  EXPECT_EQ(std::string(168, '1'), utils::rgbltoa(c.guest_schedule, 168));
}

TEST(WifiJson, ScheduleThatIsNoStringLeavesTheCells) {
  AdapterConfig c;
  c.schedule[5] = true;
  Json::Value v = Clean();
  v["schedule"] = 12345;
  ASSERT_EQ(0, utils::GetConfig(Text(v), c));
  EXPECT_TRUE(c.schedule[5]);
}

TEST(WifiJson, MacFilterListThatIsAStringIsIgnoredWithoutALog) {
  AdapterConfig c;
  Json::Value v = Clean();
  v["mac_filter_list"] = "02:00:00:00:02:01";
  v["station_list"] = "none";
  SyslogCapture log;
  ASSERT_EQ(0, utils::GetConfig(Text(v), c));
  EXPECT_TRUE(c.mac_filter_list.empty());
  EXPECT_TRUE(c.station_list.empty());
  EXPECT_TRUE(Errors(log).empty()) << log.Dump();
}

TEST(WifiJson, RulesAndStationsAreAppendedWithDefaults) {
  AdapterConfig c;
  AdapterConfig::MacFilterRule old;
  old.mac = std::string("02:00:00:00:09:09");
  c.mac_filter_list.push_back(old);
  Json::Value v = Clean();
  v["mac_filter_list"].append(Json::Value(Json::objectValue));
  Json::Value rule;
  rule["mac"] = "020000000202";
  rule["mac_filter_enabled"] = true;
  v["mac_filter_list"].append(rule);
  Json::Value station;
  station["essid"] = "x";
  station["opmode"] = "Managed";
  station["signal"] = 55;
  v["station_list"].append(station);
  ASSERT_EQ(0, utils::GetConfig(Text(v), c));
  ASSERT_EQ(3u, c.mac_filter_list.size());
  EXPECT_EQ("02:00:00:00:09:09", c.mac_filter_list[0].mac.ToString());
  EXPECT_FALSE(c.mac_filter_list[1].enabled);
  EXPECT_EQ("", c.mac_filter_list[1].mac.ToString());
  EXPECT_EQ("", c.mac_filter_list[1].desc);
  EXPECT_TRUE(c.mac_filter_list[2].enabled);
  EXPECT_EQ("02:00:00:00:02:02", c.mac_filter_list[2].mac.ToString());  // formalised
  ASSERT_EQ(1u, c.station_list.size());
  EXPECT_EQ("x", c.station_list[0].essid);
  EXPECT_EQ(0, c.station_list[0].signal);  // "signal" never comes back in
  EXPECT_EQ(0u, c.station_list[0].access_time);
  EXPECT_EQ(0, c.station_list[0].channel);
  EXPECT_FALSE(c.station_list[0].is_dhcp);
  EXPECT_EQ("Any", utils::StationInfoToJson(c.station_list[0])["opmode"].asString());
}

TEST(WifiJson, MemberOfTheWrongTypeFailsWithoutChangingTheRecord) {
  const std::vector<std::pair<const char*, Json::Value>> bad = {
      {"channel", Json::Value("six")},      {"enabled", Json::Value("yes")},
      {"channel", Json::Value(-1)},         {"max_num_client", Json::Value(Json::arrayValue)},
      {"ssid", Json::Value(Json::objectValue)}, {"CountryRegion", Json::Value(1e20)},
      {"mode", Json::Value(Json::arrayValue)},  {"mac_filter_list", Json::Value(Json::arrayValue)},
      {"station_list", Json::Value(Json::arrayValue)}};
  for (std::size_t i = 0; i < bad.size(); ++i) {
    AdapterConfig c;
    c.ssid = "kept";
    Json::Value v = Clean();
    v["ssid"] = "changed";
    v[bad[i].first] = bad[i].second;
    if (std::string(bad[i].first) == "mac_filter_list") v["mac_filter_list"].append("text");
    if (std::string(bad[i].first) == "station_list") {
      Json::Value s;
      s["access_time"] = "yesterday";
      v["station_list"].append(s);
    }
    SyslogCapture log;
    EXPECT_EQ(-1, utils::GetConfig(Text(v), c)) << i;
    EXPECT_EQ("kept", c.ssid) << i;
    EXPECT_TRUE(c.mac_filter_list.empty()) << i;
    EXPECT_EQ(1u, log.Matching(ParseFailure()).size()) << i << log.Dump();
  }
}

TEST(WifiJson, TextThatDoesNotParseFails) {
  AdapterConfig c;
  c.ssid = "kept";
  SyslogCapture log;
  EXPECT_EQ(-1, utils::GetConfig("{\"ssid\": \"x\"", c));
  EXPECT_EQ(-1, utils::GetConfig("", c));
  EXPECT_EQ("kept", c.ssid);
  EXPECT_EQ(2u, log.Matching(LogLine("wifi/utils_json.cpp", "Failed to parse config")).size())
      << log.Dump();
}

TEST(WifiJson, AwkwardTextsSurviveTheRoundTrip) {
  const std::vector<std::string> texts = {
      "quote \" and 'single'", "line\nbreak\r\n", "a=b=c", std::string(40, 'S'),
      "tab\there", "  blanks  ", "\"quoted\"", "gr\xc3\xbc\xc3\x9f \xe2\x9c\x93"};
  for (const std::string& t : texts) {
    AdapterConfig in;
    in.ssid = t;
    in.password = t;
    in.guest_ssid = t;
    AdapterConfig out;
    ASSERT_EQ(0, utils::GetConfig(utils::ToStyledText(utils::GetJsonValue(in)), out)) << t;
    EXPECT_EQ(t, out.ssid);
    EXPECT_EQ(t, out.password);
    EXPECT_EQ(t, out.guest_ssid);
  }
}

TEST(WifiJson, InvalidUtf8IsReadAsGivenAndWrittenAsReplacementCharacters) {
  Json::Value v = Clean();
  std::string text = Text(v);
  text.insert(1, "\"ssid\": \"bad \xff\xfe\xc3 bytes\",\n");
  AdapterConfig c;
  ASSERT_EQ(0, utils::GetConfig(text, c));
  EXPECT_EQ("bad \xff\xfe\xc3 bytes", c.ssid);
  // The JSON that goes out holds no raw bad byte: they leave as \ufffd escapes, and the text
  // parses again.
  const std::string out = utils::ToStyledText(utils::GetJsonValue(c));
  EXPECT_NE(std::string::npos, out.find("\"ssid\" : \"bad \\ufffd\\ufffd")) << out;
  EXPECT_EQ(std::string::npos, out.find('\xff'));
  AdapterConfig again;
  EXPECT_EQ(0, utils::GetConfig(out, again));
}

TEST(WifiJson, MacsInWrongShapesStayAsGiven) {
  for (const char* text : {"02:00:00:00:00", "zz:00:00:00:00:10", "02-00-00-00-00-10",
                           "../../etc/passwd", "0200000000101", ""}) {
    Json::Value v = Clean();
    v["bssid"] = text;
    AdapterConfig c;
    ASSERT_EQ(0, utils::GetConfig(Text(v), c));
    EXPECT_EQ(text, c.bssid.ToString());
    EXPECT_FALSE(c.bssid.IsFormalized());
  }
  Json::Value v = Clean();
  v["bssid"] = "0200000000AB";
  AdapterConfig c;
  ASSERT_EQ(0, utils::GetConfig(Text(v), c));
  EXPECT_EQ("02:00:00:00:00:AB", c.bssid.ToString());
}

TEST(WifiJson, StationJsonHasItsFifteenKeys) {
  AdapterConfig::StationInfo s;
  s.essid = "net";
  s.bssid = std::string("02:00:00:00:01:01");
  s.opmode = WIFI_OPMODE_ADHOC;
  s.signal = -40;
  s.hwmode = WIFI_MODE_AN_AC;
  Json::Value j = utils::StationInfoToJson(s);
  EXPECT_EQ((std::vector<std::string>{"access_time", "bssid", "channel", "encryption", "essid",
                                      "gateway", "hwmode", "ip", "is_dhcp", "netmask", "opmode",
                                      "password", "security", "signal", "user"}),
            j.getMemberNames());
  EXPECT_EQ("Ad", j["opmode"].asString());
  EXPECT_EQ(-40, j["signal"].asInt());
  EXPECT_EQ("an+ac", j["hwmode"].asString());
}

TEST(WifiJson, ConnectionMergeReadsOnlyPresentMembers) {
  AdapterConfig::StationInfo s;
  s.essid = "keep";
  s.user = "keep-user";
  s.channel = 9;
  s.signal = 50;
  s.is_dhcp = true;
  Json::Value j;
  j["password"] = "pw";
  j["opmode"] = "Infra";
  j["access_time"] = 77;
  j["channel"] = 1;        // not a member of a saved connection
  j["signal"] = 1;
  j["is_dhcp"] = false;
  EXPECT_EQ(0, utils::ConnectionJsonToStationInfo(j, s));
  EXPECT_EQ("keep", s.essid);
  EXPECT_EQ("keep-user", s.user);
  EXPECT_EQ("pw", s.password);
  EXPECT_EQ(WIFI_OPMODE_MANAGED, s.opmode);
  EXPECT_EQ(77u, s.access_time);
  EXPECT_EQ(9, s.channel);
  EXPECT_EQ(50, s.signal);
  EXPECT_TRUE(s.is_dhcp);
  j["access_time"] = "late";
  EXPECT_EQ(-1, utils::ConnectionJsonToStationInfo(j, s));
  EXPECT_EQ(77u, s.access_time);
}

TEST(WifiJson, BridgeConfigReadsItsMembersAndSlaves) {
  const char* text =
      "{\"ap_ip_address\": \"192.168.10.1\", \"ap_netmask\": \"255.255.255.0\","
      " \"dhcp_enabled\": true, \"dhcp_range_begin\": \"192.168.10.10\","
      " \"dhcp_range_end\": \"bogus\", \"ap_ipv6_prefix\": \"fd00::/64\", \"ipv6_pdns\": \"fd00::1\","
      " \"ipv6_sdns\": \"\", \"dhcpv6_type\": \"stateful\", \"dhcpv6_range_begin\": \"fd00::10\","
      " \"dhcpv6_range_end\": \"fd00::20\", \"slave_list\": [\"eth1\", \"wlan0\"]}";
  BridgeConfig b;
  b.slave_list.push_back("eth0");
  ASSERT_EQ(0, utils::GetConfig(text, b));
  EXPECT_EQ("192.168.10.1", b.ap_ip_address.ToString());
  EXPECT_TRUE(b.dhcp_enabled);
  EXPECT_TRUE(b.dhcp_range_end.IsEmpty());
  EXPECT_EQ("stateful", b.dhcpv6_type);
  EXPECT_EQ((std::vector<std::string>{"eth0", "eth1", "wlan0"}), b.slave_list);
  SyslogCapture log;
  EXPECT_EQ(-1, utils::GetConfig("[", b));
  EXPECT_EQ(-1, utils::GetConfig("{\"slave_list\": [[1]]}", b));
  EXPECT_EQ(3u, b.slave_list.size());
  EXPECT_EQ(1u, log.Matching(LogLine("wifi/utils_json.cpp", "Failed to parse config")).size());
  EXPECT_EQ(1u, log.Matching(ParseFailure()).size());
}

TEST(WifiJson, SmallConversions) {
  bool cells[168];
  std::fill(cells, cells + 168, true);
  EXPECT_EQ(-1, utils::SetScheduleValue(cells, std::string(100, '0')));
  EXPECT_TRUE(cells[0]);
  EXPECT_EQ(0, utils::SetScheduleValue(cells, std::string(168, '0')));
  EXPECT_FALSE(cells[0]);
  EXPECT_EQ("", utils::rgbltoa(cells, 0));
  EXPECT_EQ("-42", utils::itoa(-42));
  EXPECT_EQ("0", utils::itoa(0));
}
