// The Wi-Fi vocabulary: fixed numbers and texts, the "error" value, and the alias rule that
// decides the stored spelling of an operating mode.
#include "vornwireless/wifi/enum.h"

#include <gtest/gtest.h>

#include <utility>
#include <vector>

#include "support/syslog_capture.h"

using namespace vornwireless::wifi;
using vorntest::LogLine;
using vorntest::SyslogCapture;

namespace {

template <typename E>
void ExpectTable(const std::vector<std::pair<int, const char*>>& table) {
  for (const auto& row : table) {
    EXPECT_EQ(row.first, static_cast<int>(EnumMap<E>::StringToEnum(row.second))) << row.second;
    EXPECT_EQ(row.second, EnumMap<E>::EnumToString(static_cast<E>(row.first))) << row.first;
  }
  EXPECT_EQ(table.size(), EnumMap<E>::enumMap.size());
  EXPECT_TRUE(EnumMap<E>::blInitialized);
}

}  // namespace

TEST(WifiEnum, TablesHaveTheirFixedNumbersAndTexts) {
  ExpectTable<WIFI_TOPOLOGY>({{0, "error"}, {1, "bridge"}, {2, "router"}, {3, "client"},
                              {4, "repeater"}});
  ExpectTable<WIFI_MODE>({{0, "error"}, {1, "a"}, {2, "b"}, {3, "g"}, {4, "n"}, {5, "an"},
                          {6, "bn"}, {7, "gn"}, {8, "bg"}, {9, "bgn"}, {10, "ac"},
                          {11, "an+ac"}});
  ExpectTable<WIFI_BANDWIDTH>({{0, "error"}, {1, "20MHZ"}, {2, "20_40MHZ"}, {3, "20_40_80MHZ"}});
  ExpectTable<WIFI_POWER>({{0, "error"}, {2, "low"}, {6, "medium"}, {10, "high"}});
  ExpectTable<WIFI_SECURITY>({{0, "error"}, {1, "disabled"}, {2, "WEP"}, {3, "PERSONAL_WPA"},
                              {4, "PERSONAL_WPA2"}, {5, "PERSONAL_WPA_MIXED"},
                              {6, "ENTERPRISE_WPA"}, {7, "ENTERPRISE_WPA2"},
                              {8, "ENTERPRISE_WPA_MIXED"}});
  ExpectTable<WIFI_ENCRYPTION>({{0, "error"}, {1, "NONE"}, {2, "TKIP"}, {3, "AES"},
                                {4, "TKIP_AES"}});
  ExpectTable<WIFI_MAC_FILTER_POLICY>({{0, "error"}, {1, "deny"}, {2, "allow"}});
  ExpectTable<WIFI_DRIVER>({{0, "error"}, {1, "nl80211"}});
  ExpectTable<WIFI_FEATURE>({{0, "error"}, {1, "mac_filter"}, {2, "guest_network"},
                             {3, "parental_control"}, {4, "connection_list"}});
  ExpectTable<WIFI_STATUS>({{0, "error"}, {1, "Enabled"}, {2, "IPConflict"}, {3, "IPFailed"},
                            {4, "Disabled"}, {5, "Enabling"}, {6, "AutoEnabling"}});
}

TEST(WifiEnum, OpmodeAliasesAllReadAndTheFirstInByteOrderIsWritten) {
  const std::vector<std::pair<const char*, int>> words = {
      {"error", -1}, {"Auto", 0},  {"Ad-Hoc", 1},  {"Ad", 1},       {"Adhoc", 1},
      {"Managed", 2}, {"In", 2},   {"Infra", 2},   {"Any", 2},      {"Master", 3},
      {"Repeater", 4}, {"Secondary", 5}, {"Monitor", 6}};
  for (const auto& w : words) {
    EXPECT_EQ(w.second, static_cast<int>(EnumMap<WIFI_OPMODE>::StringToEnum(w.first))) << w.first;
  }
  EXPECT_EQ("Ad", EnumMap<WIFI_OPMODE>::EnumToString(WIFI_OPMODE_ADHOC));
  EXPECT_EQ("Any", EnumMap<WIFI_OPMODE>::EnumToString(WIFI_OPMODE_MANAGED));
  // However the value was spelled on the way in, it goes out as "Any".
  EXPECT_EQ("Any", EnumMap<WIFI_OPMODE>::EnumToString(EnumMap<WIFI_OPMODE>::StringToEnum("Managed")));
  EXPECT_EQ("Any", EnumMap<WIFI_OPMODE>::EnumToString(EnumMap<WIFI_OPMODE>::StringToEnum("Infra")));
  EXPECT_EQ("Auto", EnumMap<WIFI_OPMODE>::EnumToString(WIFI_OPMODE_AUTO));
  EXPECT_EQ("Master", EnumMap<WIFI_OPMODE>::EnumToString(WIFI_OPMODE_MASTER));
}

TEST(WifiEnum, UnknownTextIsLoggedAndGivesTheErrorValue) {
  SyslogCapture log;
  EXPECT_EQ(WIFI_MODE_ERROR, EnumMap<WIFI_MODE>::StringToEnum(""));
  EXPECT_EQ(WIFI_OPMODE_ERROR, EnumMap<WIFI_OPMODE>::StringToEnum(""));
  EXPECT_EQ(WIFI_SECURITY_ERROR, EnumMap<WIFI_SECURITY>::StringToEnum("wpa2"));  // case counts
  EXPECT_EQ(WIFI_OPMODE_ERROR, EnumMap<WIFI_OPMODE>::StringToEnum("managed"));
  EXPECT_EQ(2u, log.Matching(LogLine("wifi/enum.cpp", "Failed to find key()")).size()) << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/enum.cpp", "Failed to find key(wpa2)")));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/enum.cpp", "Failed to find key(managed)")));
  // A text with format characters is logged as it is.
  EXPECT_EQ(WIFI_POWER_ERROR, EnumMap<WIFI_POWER>::StringToEnum("%s%n"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/enum.cpp", "Failed to find key(%s%n)")));
}

TEST(WifiEnum, NumberOutsideATableGivesErrorWithoutLog) {
  SyslogCapture log;
  EXPECT_EQ("error", EnumMap<WIFI_MODE>::EnumToString(static_cast<WIFI_MODE>(12)));
  EXPECT_EQ("error", EnumMap<WIFI_POWER>::EnumToString(static_cast<WIFI_POWER>(3)));
  EXPECT_EQ("error", EnumMap<WIFI_OPMODE>::EnumToString(static_cast<WIFI_OPMODE>(7)));
  EXPECT_EQ("error", EnumMap<WIFI_OPMODE>::EnumToString(static_cast<WIFI_OPMODE>(-2)));
  EXPECT_EQ("error", EnumMap<WIFI_TOPOLOGY>::EnumToString(static_cast<WIFI_TOPOLOGY>(-1)));
  EXPECT_TRUE(log.Lines().empty()) << log.Dump();
}

TEST(WifiEnum, InitializingAgainChangesNothing) {
  EnumMap<WIFI_SECURITY>::initializeMap();
  const auto before = EnumMap<WIFI_SECURITY>::enumMap;
  EnumMap<WIFI_SECURITY>::initializeMap();
  EXPECT_EQ(before, EnumMap<WIFI_SECURITY>::enumMap);
  EXPECT_EQ(9u, EnumMap<WIFI_SECURITY>::enumMap.size());
}
