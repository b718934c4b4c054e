// The ARP scanner against real neighbours on a bridge (peer hosts behind veth), the lease file in
// the DHCP server's format and a NetBIOS responder for the real nmblookup; the Wi-Fi scanner
// against recording fakes of hostapd_cli and iw.
#include <gtest/gtest.h>
#include <unistd.h>

#include <string>

#include "fixtures/fake_journal.h"
#include "lan_fixture.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "vornwireless/network/devicelist/arp_scanner.h"
#include "vornwireless/network/devicelist/wifi_scanner.h"

using vornnetwork::network::module::ArpScanner;
using vornnetwork::network::module::WifiScanner;
using vorntest::LogLine;
using vorntest::SyslogCapture;

namespace {

const char kLeases[] = "/etc/dhcpd/dhcpd.conf.leases";
const char kArpSource[] = "network/devicelist/arp_scanner.cpp";
const char kWifiSource[] = "network/devicelist/wifi_scanner.cpp";

class ArpScannerTest : public ::testing::Test {
 protected:
  static void SetUpTestSuite() {
    std::string why;
    ASSERT_TRUE(vorntest::SetUpRouterLan(&why)) << why;
  }
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    ::mkdir("/etc/dhcpd", 0755);
    unlink(kLeases);
    lanMac = vorntest::PeerMac("lan0");
    ASSERT_FALSE(lanMac.empty());
    ASSERT_EQ(vorntest::PingOnce("10.200.1.1"), 0);
    ASSERT_EQ(vorntest::PingOnce("10.200.2.1"), 0);
  }
  // The device of one IP in a scanner list, null when absent.
  static Json::Value Find(Json::Value const& data, std::string const& ip) {
    for (auto const& d : data["ClientList"]) {
      if (d["ipAddr"].asString() == ip) return d;
    }
    return Json::Value();
  }
  std::string lanMac;
};

TEST_F(ArpScannerTest, RouterListsBridgeNeighbourNamedFromLeaseFileAndNotTheWanOne) {
  ASSERT_TRUE(vorntest::SetTopology("router"));
  ASSERT_TRUE(vorntest::WriteFile(
      kLeases, "1732500000 02:00:00:00:00:99 10.200.1.50 other *\n"
               "1732500100 " + lanMac + " 10.200.1.1 laptop 01:" + lanMac + "\n"));
  Json::Value data = ArpScanner::Inst()->GetData();
  Json::Value d = Find(data, "10.200.1.1");
  ASSERT_TRUE(d.isObject()) << data.toStyledString();
  EXPECT_EQ(d["macAddr"].asString(), lanMac);
  EXPECT_EQ(d["netif"].asString(), "br0");
  EXPECT_EQ(d["friendlyName"].asString(), "laptop");
  EXPECT_EQ(d["displayName"].asString(), "laptop");
  EXPECT_TRUE(Find(data, "10.200.2.1").isNull()) << "eth0 neighbour listed";
}

TEST_F(ArpScannerTest, BridgeTopologyNamesByNetbiosUniqueNameNotTheGroupAndIgnoresLeases) {
  ASSERT_TRUE(vorntest::SetTopology("bridge"));
  ASSERT_TRUE(vorntest::WriteFile(kLeases, "1732500100 " + lanMac + " 10.200.1.1 laptop *\n"));
  vorntest::PeerProcess responder("lan0",
                                  {vorntest::DeviceListFixture("netbios-responder"), "MEDIABOX",
                                   "HOMEGROUP"},
                                  "ready");
  ASSERT_TRUE(responder.ready()) << responder.Output();
  Json::Value d = Find(ArpScanner::Inst()->GetData(), "10.200.1.1");
  EXPECT_EQ(d["friendlyName"].asString(), "MEDIABOX");
}

TEST_F(ArpScannerTest, RouterFallsBackToNetbiosWhenTheLeaseFileHasNoName) {
  ASSERT_TRUE(vorntest::SetTopology("router"));
  // Odd lines: blank, too short, the MAC with fewer than four words.
  ASSERT_TRUE(vorntest::WriteFile(kLeases, "\n   \ngarbage\n1732500100 " + lanMac + " 10.200.1.1\n"));
  vorntest::PeerProcess responder("lan0", {vorntest::DeviceListFixture("netbios-responder"), "NAS"},
                                  "ready");
  ASSERT_TRUE(responder.ready());
  Json::Value d = Find(ArpScanner::Inst()->GetData(), "10.200.1.1");
  EXPECT_EQ(d["friendlyName"].asString(), "NAS");
}

TEST_F(ArpScannerTest, MissingLeaseFileIsLoggedAndNetbiosNamesTheDevice) {
  ASSERT_TRUE(vorntest::SetTopology("router"));
  vorntest::PeerProcess responder("lan0", {vorntest::DeviceListFixture("netbios-responder"), "TV"},
                                  "ready");
  ASSERT_TRUE(responder.ready());
  SyslogCapture log;
  Json::Value d = Find(ArpScanner::Inst()->GetData(), "10.200.1.1");
  EXPECT_EQ(d["friendlyName"].asString(), "TV");
  EXPECT_FALSE(log.Matching(LogLine(kArpSource, "Failed to open dhcp leases file")).empty())
      << log.Dump();
}

TEST_F(ArpScannerTest, NoNameAnywhereLeavesFriendlyNameOut) {
  ASSERT_TRUE(vorntest::SetTopology("router"));
  ASSERT_TRUE(vorntest::WriteFile(kLeases, ""));
  // No responder: nmblookup reports "No reply" and an empty last line.
  Json::Value d = Find(ArpScanner::Inst()->GetData(), "10.200.1.1");
  ASSERT_TRUE(d.isObject());
  EXPECT_FALSE(d.isMember("friendlyName"));
  EXPECT_EQ(d["displayName"].asString(), "General DMA");
}

TEST_F(ArpScannerTest, IncompleteEntryWithAllZeroMacIsListedAsItStands) {
  ASSERT_TRUE(vorntest::SetTopology("router"));
  ASSERT_TRUE(vorntest::WriteFile(kLeases, ""));
  EXPECT_NE(vorntest::PingOnce("10.200.1.77"), 0);  // nobody there
  std::string line = vorntest::ArpLine("10.200.1.77");
  ASSERT_NE(line.find("00:00:00:00:00:00"), std::string::npos) << line;
  Json::Value d = Find(ArpScanner::Inst()->GetData(), "10.200.1.77");
  ASSERT_TRUE(d.isObject());
  EXPECT_EQ(d["macAddr"].asString(), "00:00:00:00:00:00");
  EXPECT_EQ(d["netif"].asString(), "br0");
  vorntest::Ip({"neigh", "flush", "dev", "br0", "to", "10.200.1.77"});
}

TEST_F(ArpScannerTest, OnlyDevicesWhoseNameHoldsBrAreListed) {
  ASSERT_TRUE(vorntest::SetTopology("bridge"));
  vorntest::InstallFake(VORN_NMBLOOKUP);  // answers nothing, quickly
  ArpScanner* s = ArpScanner::Inst();
  s->GetData();  // fresh list
  vorntest::ClearFakeJournal();
  EXPECT_EQ(s->AppendClientList("IP address HW type Flags HW address Mask Device\n"), 0);
  EXPECT_EQ(s->AppendClientList("10.9.9.1 0x1 0x2 02:00:00:00:00:01 * eth0\n"), 0);
  EXPECT_EQ(s->AppendClientList("10.9.9.2 0x1 0x2 02:00:00:00:00:02 * vlanbr5\n"), 0);
  EXPECT_EQ(s->AppendClientList("10.9.9.3 0x1 0x2 02:00:00:00:00:03 *\n"), 0);
  EXPECT_EQ(s->AppendClientList("\n"), 0);
  auto calls = vorntest::FakeCallsTo(VORN_NMBLOOKUP);
  ASSERT_EQ(calls.size(), 1u);
  EXPECT_EQ(calls[0].argv, (std::vector<std::string>{"-A", "10.9.9.2"}));
  unlink(VORN_NMBLOOKUP);
}

TEST_F(ArpScannerTest, NmblookupMissingIsLoggedAndTheDeviceStaysUnnamed) {
  ASSERT_TRUE(vorntest::SetTopology("bridge"));
  unlink(VORN_NMBLOOKUP);
  SyslogCapture log;
  Json::Value d = Find(ArpScanner::Inst()->GetData(), "10.200.1.1");
  ASSERT_TRUE(d.isObject());
  EXPECT_FALSE(d.isMember("friendlyName"));
  EXPECT_FALSE(log.Matching(LogLine(kArpSource,
                                    "Failed to execute cmd [/usr/bin/nmblookup -A 10.200.1.1]"))
                   .empty())
      << log.Dump();
}

TEST_F(ArpScannerTest, ClientTopologyGivesAnEmptyList) {
  ASSERT_TRUE(vorntest::SetTopology("client"));
  EXPECT_EQ(ArpScanner::Inst()->GetData()["ClientList"].size(), 0u);
  unlink("/etc/vorninfo.conf");
  EXPECT_EQ(ArpScanner::Inst()->GetData()["ClientList"].size(), 0u);
}

TEST(NmblookupOutput, UniqueActiveLinesInBothNotations) {
  EXPECT_TRUE(ArpScanner::IsUniqueActiveLine("\tMEDIABOX        <00> -         B <ACTIVE> \n"));
  EXPECT_FALSE(ArpScanner::IsUniqueActiveLine("\tHOME            <00> - <GROUP> B <ACTIVE> \n"));
  EXPECT_TRUE(ArpScanner::IsUniqueActiveLine("NAS#ACTIVE$ 00\n"));
  EXPECT_FALSE(ArpScanner::IsUniqueActiveLine("WG#GROUP$ #ACTIVE$\n"));
  EXPECT_FALSE(ArpScanner::IsUniqueActiveLine("Looking up status of 10.0.0.1\n"));
}

// ---- Wi-Fi ----

class WifiScannerTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    ASSERT_TRUE(vorntest::SetTopology("router"));
    ASSERT_TRUE(vorntest::InstallFake(VORN_HOSTAPD_CLI));
    ASSERT_TRUE(vorntest::InstallFake(VORN_IW));
    vorntest::ClearFakeJournal();
    vorntest::WriteFakeReplies(Json::Value(Json::objectValue));
  }
  static void Reply(std::string const& program, std::vector<std::string> const& args,
                    std::string const& out) {
    Json::Value e(Json::objectValue);
    for (auto const& a : args) e["args"].append(a);
    e["stdout"] = out;
    vorntest::AddFakeReply(program, e);
  }
};

TEST_F(WifiScannerTest, StationsAppearWithInterfaceCountersAndSignal) {
  Reply(VORN_HOSTAPD_CLI, {"interface"}, "Selected interface 'wlan0'\nAvailable interfaces:\nwlan0\nwlan1\n");
  Reply(VORN_HOSTAPD_CLI, {"-i", "wlan0", "all_sta"},
        "02:11:22:33:44:55\nflags=[AUTH][ASSOC]\nrx_packets=10\n"
        "aa:bb:cc:dd:ee:0F\nconnected_time=5\nnot-a-mac\n");
  Reply(VORN_HOSTAPD_CLI, {"-i", "wlan1", "all_sta"}, "");
  Reply(VORN_IW, {"dev", "wlan0", "station", "get", "02:11:22:33:44:55"},
        "Station 02:11:22:33:44:55 (on wlan0)\n\tinactive time:\t10 ms\n\trx bytes:\t12345\n"
        "\trx packets:\t100\n\ttx bytes:\t6789\n\ttx packets:\t50\n\tsignal:  \t-52 [-52] dBm\n"
        "\tsignal avg:\t-36 [-36] dBm\n\ttx bitrate:\t65.0 MBit/s\n");
  Reply(VORN_IW, {"dev", "wlan0", "station", "get", "aa:bb:cc:dd:ee:0F"},
        "\trx bytes:\t1\n\ttx bytes:\t2\n\tsignal avg:\t-99 dBm\n");
  Json::Value data = WifiScanner::Inst()->GetData();
  Json::Value list = data["ClientList"];
  ASSERT_EQ(list.size(), 2u) << data.toStyledString();
  EXPECT_EQ(list[0]["macAddr"].asString(), "02:11:22:33:44:55");
  EXPECT_EQ(list[0]["connection"].asString(), "wifi");
  EXPECT_EQ(list[0]["netif"].asString(), "wlan0");
  EXPECT_EQ(list[0]["transferRX"].asString(), "12345");
  EXPECT_EQ(list[0]["transferTX"].asString(), "6789");
  EXPECT_EQ(list[0]["signalstrength"].asInt(), 99);
  EXPECT_EQ(list[1]["macAddr"].asString(), "aa:bb:cc:dd:ee:0F");
  EXPECT_EQ(list[1]["signalstrength"].asInt(), 2);
  auto cli = vorntest::FakeCallsTo(VORN_HOSTAPD_CLI);
  ASSERT_EQ(cli.size(), 3u);
  EXPECT_EQ(cli[0].argv, (std::vector<std::string>{"interface"}));
  EXPECT_EQ(cli[1].argv, (std::vector<std::string>{"-i", "wlan0", "all_sta"}));
  EXPECT_EQ(cli[2].argv, (std::vector<std::string>{"-i", "wlan1", "all_sta"}));
  // The list is handed out once.
  vorntest::WriteFakeReplies(Json::Value(Json::objectValue));
  EXPECT_EQ(WifiScanner::Inst()->GetData()["ClientList"].size(), 0u);
}

TEST_F(WifiScannerTest, MissingIwKeepsTheStationWithoutLinkData) {
  Reply(VORN_HOSTAPD_CLI, {"interface"}, "wlan0\n");
  Reply(VORN_HOSTAPD_CLI, {"-i", "wlan0", "all_sta"}, "02:11:22:33:44:56\n");
  unlink(VORN_IW);
  SyslogCapture log;
  Json::Value list = WifiScanner::Inst()->GetData()["ClientList"];
  ASSERT_EQ(list.size(), 1u);
  EXPECT_EQ(list[0]["netif"].asString(), "wlan0");
  EXPECT_FALSE(list[0].isMember("signalstrength"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kWifiSource, "failed to iw dev for wifi data")))
      << log.Dump();
}

TEST_F(WifiScannerTest, MissingHostapdCliIsLoggedAndGivesNothing) {
  unlink(VORN_HOSTAPD_CLI);
  SyslogCapture log;
  EXPECT_EQ(WifiScanner::Inst()->GetData()["ClientList"].size(), 0u);
  EXPECT_FALSE(log.Matching(LogLine(kWifiSource, "Failed to execute cmd [/usr/bin/hostapd_cli, error(2):(No such file or directory)")).empty())
      << log.Dump();
}

TEST_F(WifiScannerTest, ClientTopologyGivesAnEmptyListWithoutAskingHostapd) {
  ASSERT_TRUE(vorntest::SetTopology("client"));
  Reply(VORN_HOSTAPD_CLI, {"interface"}, "wlan0\n");
  Reply(VORN_HOSTAPD_CLI, {"-i", "wlan0", "all_sta"}, "02:11:22:33:44:55\n");
  EXPECT_EQ(WifiScanner::Inst()->GetData()["ClientList"].size(), 0u);
  EXPECT_TRUE(vorntest::FakeCallsTo(VORN_HOSTAPD_CLI).empty());
}

TEST(WifiSignal, DbmToPercent) {
  EXPECT_EQ(WifiScanner::ConvertDbmToPercent(-35), 100);
  EXPECT_EQ(WifiScanner::ConvertDbmToPercent(-36), 99);
  EXPECT_EQ(WifiScanner::ConvertDbmToPercent(-99), 2);
  EXPECT_EQ(WifiScanner::ConvertDbmToPercent(-100), 0);
  EXPECT_EQ(WifiScanner::ConvertDbmToPercent(-20), 100);
  EXPECT_EQ(WifiScanner::ConvertDbmToPercent(-120), 0);
  EXPECT_EQ(WifiScanner::ConvertDbmToPercent(-67), 51);  // 33*100/65 = 50.8
}

TEST(WifiSignal, MacPattern) {
  char const* p = "^([0-9a-fA-F][0-9a-fA-F]:){5}([0-9a-fA-F][0-9a-fA-F])$";
  EXPECT_EQ(WifiScanner::RegMatch("02:aA:00:11:22:33", p), 1);
  EXPECT_EQ(WifiScanner::RegMatch("02:aA:00:11:22", p), 0);
  EXPECT_EQ(WifiScanner::RegMatch("02:aA:00:11:22:33:44", p), 0);
  EXPECT_EQ(WifiScanner::RegMatch("x", "(("), -1);
}

}  // namespace
