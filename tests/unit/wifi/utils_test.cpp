// Reads of the machine's state for the Wi-Fi code, against the sandbox's radio, real bridges and
// real key files. The radio seam (libvornradio.so) is preloaded into this test.
#include "vornwireless/wifi/utils.h"

#include <unistd.h>

#include <gtest/gtest.h>

#include <sstream>

#include "fixtures/fake_journal.h"
#include "fixtures/fake_radio.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"

using namespace vornwireless::wifi;
using vorntest::IpOk;
using vorntest::LogLine;
using vorntest::ReadFile;
using vorntest::SyslogCapture;
using vorntest::WriteFile;

namespace {

Json::Value Scenario(const std::string& quality = "70/100") {
  Json::Value s;
  s["adapters"]["wlan0"] = vorntest::RadioAdapter("02:00:00:00:00:10", "bgn");
  s["adapters"]["wlan1"] = vorntest::RadioAdapter("02:00:00:00:00:20", "an");
  if (quality == "none") {
    s["adapters"]["wlan0"]["quality"] = Json::Value();
  } else {
    s["adapters"]["wlan0"]["quality"] = quality;
  }
  s["proc"]["pcie_wifi_ifname"] = "wlan0 built-in\n";
  s["proc"]["sys/kernel/vorn_mac_address3"] = "00:11:22:33:44:55\n";
  return s;
}

class WifiUtils : public ::testing::Test {
 protected:
  static void SetUpTestSuite() {
    ASSERT_TRUE(vorntest::InSandbox());
    std::string why;
    ASSERT_TRUE(vorntest::InstallRadio(Scenario(), &why)) << why;
  }
  void SetUp() override {
    ASSERT_TRUE(vorntest::SetRadioScenario(Scenario()));
    vorntest::Run({"/bin/rm", "-f", "/etc/vorninfo.conf", "/var/run/vornwifid.pid",
                   "/usr/bin/get_key_value", "/run/openvswitch/ovs-vswitchd.pid"});
    vorntest::ClearFakeJournal();
  }
};

}  // namespace

TEST_F(WifiUtils, FirstBootWithoutTopologyKeyBecomesClient) {
  EXPECT_EQ(WIFI_TOPOLOGY_CLIENT, utils::ReadTopology());
  EXPECT_EQ("net_topology=\"client\"\n", ReadFile("/etc/vorninfo.conf"));
  ASSERT_TRUE(WriteFile("/etc/vorninfo.conf", "unique=x\nnet_topology=\"router\"\n"));
  EXPECT_EQ(WIFI_TOPOLOGY_ROUTER, utils::ReadTopology());
  ASSERT_TRUE(WriteFile("/etc/vorninfo.conf", "net_topology=mesh\n"));
  SyslogCapture log;
  EXPECT_EQ(WIFI_TOPOLOGY_ERROR, utils::ReadTopology());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/enum.cpp", "Failed to find key(mesh)")));
}

TEST_F(WifiUtils, UnreadableInfoFileGivesNoTopology) {
  ASSERT_EQ(0, vorntest::Run({"/bin/mkdir", "/etc/vorninfo.conf"}).status);
  SyslogCapture log;
  EXPECT_EQ(WIFI_TOPOLOGY_ERROR, utils::ReadTopology());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/utils.cpp",
                                           "Failed to Get Key [net_topology] from config "
                                           "[/etc/vorninfo.conf]")));
  EXPECT_EQ(-1, utils::WriteTopology(WIFI_TOPOLOGY_BRIDGE));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/utils.cpp",
                                           "Failed to write value [bridge] to key [net_topology] "
                                           "for config [/etc/vorninfo.conf]")));
  vorntest::Run({"/bin/rmdir", "/etc/vorninfo.conf"});
}

TEST_F(WifiUtils, TopologyKeysAndTheirTexts) {
  ASSERT_EQ(0, utils::WriteTopology(WIFI_TOPOLOGY_BRIDGE));
  EXPECT_EQ("net_topology=\"bridge\"\n", ReadFile("/etc/vorninfo.conf"));
  std::string text;
  EXPECT_EQ(0, utils::GetTopologyString(text));
  EXPECT_EQ("none", text);  // no daemon behind the pid file
  ASSERT_TRUE(WriteFile("/var/run/vornwifid.pid", std::to_string(getpid()) + "\n"));
  EXPECT_EQ(0, utils::GetTopologyString(text));
  EXPECT_EQ("bridge", text);
  ASSERT_TRUE(WriteFile("/etc/vorninfo.conf", "net_topology=bad\n"));
  SyslogCapture log;
  EXPECT_EQ(-1, utils::GetTopologyString(text));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/utils.cpp", "Failed to read current topology")));

  EXPECT_FALSE(utils::IsSupportTopology());
  EXPECT_EQ(0, utils::SetSupportNetTopology(true));
  EXPECT_TRUE(utils::IsSupportTopology());
  EXPECT_NE(std::string::npos, ReadFile("/etc/vorninfo.conf").find("support_net_topology=\"yes\"\n"));
  EXPECT_EQ(0, utils::SetSupportNetTopology(false));
  EXPECT_FALSE(utils::IsSupportTopology());
  EXPECT_FALSE(utils::HasWifiDongle());
  ASSERT_TRUE(WriteFile("/etc/vorninfo.conf", "has_wifi_dongle=\"yes\"\n"));
  EXPECT_TRUE(utils::HasWifiDongle());
}

TEST_F(WifiUtils, SupportedModesNeedEveryDongleToHaveTheModule) {
  vorntest::Run({"/bin/sh", "-c", "rm -f /tmp/wireless.info*"});
  std::string out = "stale";
  EXPECT_EQ(0, utils::GetSupportedMode(out));
  EXPECT_EQ("", out);
  ASSERT_TRUE(WriteFile("/tmp/wireless.info.1", "AP_MODULE=rt2800usb\n"));
  EXPECT_EQ(0, utils::GetSupportedMode(out));
  EXPECT_EQ("bridge router ", out);  // no CLIENT_MODULE
  ASSERT_TRUE(WriteFile("/tmp/wireless.info.1", "AP_MODULE=rt2800usb\nCLIENT_MODULE=rt2800usb\n"));
  EXPECT_EQ(0, utils::GetSupportedMode(out));
  EXPECT_EQ("bridge router client", out);
  ASSERT_TRUE(WriteFile("/tmp/wireless.info.2", "AP_MODULE=\nCLIENT_MODULE=x\n"));
  EXPECT_EQ(0, utils::GetSupportedMode(out));
  EXPECT_EQ("client", out);
  vorntest::Run({"/bin/sh", "-c", "rm -f /tmp/wireless.info*"});
}

TEST_F(WifiUtils, SignalStrengthFromIwconfig) {
  const std::vector<std::pair<std::string, int>> cases = {
      {"70/100", 70}, {"45/70", 64}, {"0/0", 0}, {"55", 55}, {"none", 70}, {"100/100", 100}};
  for (const auto& c : cases) {
    ASSERT_TRUE(vorntest::SetRadioScenario(Scenario(c.first)));
    EXPECT_EQ(c.second, utils::GetSignalStrength("wlan0")) << c.first;
  }
  auto calls = vorntest::FakeCallsTo("/sbin/iwconfig");
  ASSERT_FALSE(calls.empty());
  EXPECT_EQ(std::vector<std::string>{"wlan0"}, calls.back().argv);
  // An interface iwconfig does not know: no quality line.
  EXPECT_EQ(70, utils::GetSignalStrength("lo"));
  ASSERT_EQ(0, vorntest::Run({"/bin/mv", "/sbin/iwconfig", "/sbin/iwconfig.away"}).status);
  SyslogCapture log;
  EXPECT_EQ(-1, utils::GetSignalStrength("wlan0"));
  vorntest::Run({"/bin/mv", "/sbin/iwconfig.away", "/sbin/iwconfig"});
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/utils.cpp",
                                           "Failed on command iwconfig to get singal quality")));
}

TEST_F(WifiUtils, BridgeNamesByTopology) {
  EXPECT_EQ("br0", utils::GetBridgeName(WIFI_TOPOLOGY_BRIDGE));
  EXPECT_EQ("lbr0", utils::GetBridgeName(WIFI_TOPOLOGY_ROUTER));
  EXPECT_EQ("", utils::GetBridgeName(WIFI_TOPOLOGY_CLIENT));  // a client has no main bridge
  EXPECT_EQ("", utils::GetBridgeName(WIFI_TOPOLOGY_REPEATER));
  std::ostringstream s1, s2, s3;
  utils::GetBridgeConfigName(WIFI_TOPOLOGY_BRIDGE, s1);
  utils::GetBridgeConfigName(WIFI_TOPOLOGY_ROUTER, s2);
  EXPECT_EQ("/usr/vorn/etc/wifi/wifi_topology_bridge", s1.str());
  EXPECT_EQ("/usr/vorn/etc/wifi/wifi_topology_router", s2.str());
  // While the open-vswitch daemon runs.
  ASSERT_EQ(0, vorntest::Run({"/bin/mkdir", "-p", "/run/openvswitch"}).status);
  ASSERT_TRUE(WriteFile("/run/openvswitch/ovs-vswitchd.pid", std::to_string(getpid()) + "\n"));
  EXPECT_EQ("ovs_eth0", utils::GetBridgeName(WIFI_TOPOLOGY_BRIDGE));
  EXPECT_EQ("lbr0", utils::GetBridgeName(WIFI_TOPOLOGY_ROUTER));
  utils::GetBridgeConfigName(WIFI_TOPOLOGY_BRIDGE, s3);
  EXPECT_EQ("/usr/vorn/etc/wifi/wifi_topology_bridge_ovs_nc", s3.str());
}

TEST_F(WifiUtils, SlaveOfABridgeFromTheRealBrctl) {
  vorntest::Ip({"link", "del", "br0"});
  vorntest::Ip({"link", "del", "lbr0"});
  IpOk({"link", "add", "lbr0", "type", "bridge"});
  IpOk({"link", "add", "eth7", "type", "veth", "peer", "name", "eth7-peer"});
  IpOk({"link", "set", "eth7", "master", "lbr0"});
  std::string slave = "stale";
  // "br0" is found inside "lbr0": the line of lbr0 answers for a bridge that does not exist.
  EXPECT_EQ(0, utils::GetFirstExistentSlaveByBridge("br0", slave));
  EXPECT_EQ("eth7", slave);
  IpOk({"link", "add", "br0", "type", "bridge"});
  EXPECT_EQ(0, utils::GetFirstExistentSlaveByBridge("br0", slave));
  EXPECT_EQ("", slave);  // br0 comes first and has no slave
  IpOk({"link", "add", "eth8", "type", "veth", "peer", "name", "eth8-peer"});
  IpOk({"link", "add", "eth9", "type", "veth", "peer", "name", "eth9-peer"});
  IpOk({"link", "set", "eth8", "master", "br0"});
  IpOk({"link", "set", "eth9", "master", "br0"});
  EXPECT_EQ(0, utils::GetFirstExistentSlaveByBridge("br0", slave));
  EXPECT_EQ("eth8", slave);
  EXPECT_EQ(0, utils::GetFirstExistentSlaveByBridge("lbr0", slave));
  EXPECT_EQ("eth7", slave);
  auto calls = vorntest::FakeCallsTo("/usr/bin/brctl");
  EXPECT_TRUE(calls.empty());  // the real program answered
  for (const char* l : {"br0", "lbr0", "eth7", "eth8", "eth9"}) vorntest::Ip({"link", "del", l});
}

TEST_F(WifiUtils, LeaseAndArpLookups) {
  ASSERT_EQ(0, vorntest::Run({"/bin/mkdir", "-p", "/etc/dhcpd"}).status);
  ASSERT_TRUE(WriteFile("/etc/dhcpd/dhcpd.conf.leases",
                        "1700000000 02:00:00:00:03:01 192.168.1.20 laptop 01:02:00:00:00:03:01\n"
                        "1700000001 02:00:00:00:03:02 192.168.1.21 * *\n"));
  vornwireless::utils::IPAddress ip;
  std::string host = "untouched";
  EXPECT_EQ(0, utils::GetDHCPInfoByMAC(std::string("02:00:00:00:03:01"), ip, host));
  EXPECT_EQ("192.168.1.20", ip.ToString());
  EXPECT_EQ("laptop", host);
  vornwireless::utils::IPAddress none;
  std::string host2 = "untouched";
  EXPECT_EQ(0, utils::GetDHCPInfoByMAC(std::string("02:00:00:00:09:09"), none, host2));
  EXPECT_TRUE(none.IsEmpty());
  EXPECT_EQ("untouched", host2);
  vorntest::Run({"/bin/rm", "-f", "/etc/dhcpd/dhcpd.conf.leases"});
  SyslogCapture log;
  EXPECT_EQ(-1, utils::GetDHCPInfoByMAC(std::string("02:00:00:00:03:01"), ip, host));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/utils.cpp", "Failed to open dhcp leases file")));

  // The kernel's own neighbour table.
  IpOk({"link", "set", "rp-wlan1", "up"});
  IpOk({"link", "set", "wlan1", "up"});
  IpOk({"addr", "add", "10.77.0.1/24", "dev", "wlan1"});
  IpOk({"neigh", "replace", "10.77.0.9", "lladdr", "02:00:00:00:03:03", "dev", "wlan1", "nud",
        "permanent"});
  vornwireless::utils::IPAddress arp;
  std::string h = "kept";
  EXPECT_EQ(0, utils::GetArpInfoByMAC(std::string("02:00:00:00:03:03"), arp, h));
  EXPECT_EQ("10.77.0.9", arp.ToString());
  EXPECT_EQ("kept", h);
  EXPECT_EQ(-1, utils::GetArpInfoByMAC(std::string("02:00:00:00:03:04"), arp, h));
  vorntest::Ip({"addr", "flush", "dev", "wlan1"});
  vorntest::Ip({"link", "set", "wlan1", "down"});
}

TEST_F(WifiUtils, ConnectedAccessPointWithoutSupplicantFileStillHasASignal) {
  vorntest::Run({"/bin/rm", "-f", "/usr/vorn/etc/wpa_supplicant.conf.wlan0"});
  AdapterConfig c;
  c.interface = "wlan0";
  AdapterConfig::StationInfo s;
  s.essid = "Home";
  s.bssid = std::string("02:00:00:00:01:01");
  c.station_list = {s};
  Json::Value json;
  EXPECT_EQ(0, utils::GetConnectedAPInfo(c, json));
  EXPECT_EQ(70, json["signal"].asInt());
  EXPECT_FALSE(json.isMember("essid"));  // no station matches 00:00:00:00:00:00

  ASSERT_EQ(0, vorntest::Run({"/bin/mkdir", "-p", "/usr/vorn/etc"}).status);
  ASSERT_TRUE(WriteFile("/usr/vorn/etc/wpa_supplicant.conf.wlan0",
                        "ctrl_interface=/var/run/wpa_supplicant\nnetwork={\n\tssid=\"Home\"\n"
                        "\tbssid=02:00:00:00:01:01\n}\n"));
  Json::Value found;
  EXPECT_EQ(0, utils::GetConnectedAPInfo(c, found));
  EXPECT_EQ("Home", found["essid"].asString());
  EXPECT_EQ(70, found["signal"].asInt());
  EXPECT_EQ("", found["ip"].asString());

  // On DHCP the lease's address stands in for the station's.
  ASSERT_EQ(0, vorntest::Run({"/bin/mkdir", "-p", "/etc/sysconfig/network-scripts",
                              "/etc/dhclient/ipv4"}).status);
  ASSERT_TRUE(WriteFile("/etc/sysconfig/network-scripts/ifcfg-wlan0", "DEVICE=wlan0\nBOOTPROTO=dhcp\n"));
  ASSERT_TRUE(WriteFile("/etc/dhclient/ipv4/dhcpcd-wlan0.info",
                        "IPADDR=192.168.1.50\nNETMASK=255.255.255.0\n"));
  Json::Value dhcp;
  EXPECT_EQ(0, utils::GetConnectedAPInfo(c, dhcp));
  EXPECT_EQ("192.168.1.50", dhcp["ip"].asString());
  EXPECT_EQ("255.255.255.0", dhcp["netmask"].asString());
  EXPECT_EQ("", dhcp["gateway"].asString());
  vorntest::Run({"/bin/rm", "-f", "/etc/sysconfig/network-scripts/ifcfg-wlan0"});

  ASSERT_TRUE(vorntest::SetRadioScenario(Scenario("150/100")));
  SyslogCapture log;
  Json::Value bad;
  EXPECT_EQ(-1, utils::GetConnectedAPInfo(c, bad));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/utils.cpp",
                                           "Error value of signal strength for [wlan0]")));
}

TEST_F(WifiUtils, InterfacesOfTheRadio) {
  EXPECT_EQ("02:00:00:00:00:10", utils::GetBssid("wlan0"));
  SyslogCapture log;
  EXPECT_EQ("", utils::GetBssid("wlan7"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/utils.cpp",
                                           "Failed to open [/sys/class/net/wlan7/address]")));
  EXPECT_EQ("", utils::GetBssid("../../../etc"));
  EXPECT_EQ(2, utils::GetAdapterNum());
  EXPECT_EQ(0, utils::GetWirelessIndex("wlan0"));
  EXPECT_EQ(12, utils::GetWirelessIndex("wlan12"));
  EXPECT_EQ(-1, utils::GetWirelessIndex("eth0"));
  EXPECT_EQ(-1, utils::GetWirelessIndex("wlanx"));
  EXPECT_EQ(3, utils::GetGuestBridgeIndex("gbr3"));
  EXPECT_EQ(-1, utils::GetGuestBridgeIndex("br0"));

  EXPECT_FALSE(utils::IsNetActivate("wlan0"));  // down
  IpOk({"link", "set", "wlan0", "up"});
  EXPECT_FALSE(utils::IsNetActivate("wlan0"));  // up, but the peer is down: no link
  IpOk({"link", "set", "rp-wlan0", "up"});
  for (int i = 0; i < 50 && !utils::IsNetActivate("wlan0"); ++i) usleep(20000);
  EXPECT_TRUE(utils::IsNetActivate("wlan0"));
  IpOk({"link", "set", "rp-wlan0", "down"});
  IpOk({"link", "set", "wlan0", "down"});
  EXPECT_FALSE(utils::IsNetActivate("wlan9"));
}

TEST_F(WifiUtils, BuiltInRadioIdentity) {
  EXPECT_TRUE(utils::Is715SkyBuiltInWlan("wlan0"));  // first word of /proc/pcie_wifi_ifname
  EXPECT_FALSE(utils::Is715SkyBuiltInWlan("wlan1"));
  EXPECT_FALSE(utils::Is715SkyBuiltInWlan("built-in"));
  EXPECT_FALSE(utils::Is713SkyBuiltInWlan("wlan0"));  // no 713 model
  EXPECT_TRUE(utils::IsSkyBuiltInWlan("wlan0"));
  EXPECT_FALSE(utils::IsSkyBuiltInWlan("wlan1"));
  EXPECT_FALSE(utils::IsGuestNetworkSupport("wlan0"));  // not a wireless model
  ASSERT_TRUE(WriteFile("/usr/bin/get_key_value", "#!/bin/sh\necho vs_x86_713sky_r1\n", 0755));
  EXPECT_TRUE(utils::IsGuestNetworkSupport("wlan0"));
  EXPECT_FALSE(utils::IsGuestNetworkSupport("wlan1"));
  EXPECT_FALSE(utils::IsGuestNetworkSupport("wlan00"));

  Json::Value s = Scenario();
  s["proc"].removeMember("pcie_wifi_ifname");
  ASSERT_TRUE(vorntest::SetRadioScenario(s));
  EXPECT_FALSE(utils::Is715SkyBuiltInWlan("wlan0"));
}

TEST_F(WifiUtils, RltModuleWithTheAddressOfTheKernel) {
  vornwireless::utils::MacAddress mac;
  EXPECT_EQ(0, utils::Get715SkyWlanMacAddress(mac));
  EXPECT_EQ("00:11:22:33:44:55", mac.ToString());
  ASSERT_TRUE(vorntest::InstallFake("/sbin/insmod"));
  ASSERT_TRUE(vorntest::InstallFake("/sbin/rmmod"));
  EXPECT_EQ(0, utils::InsertRLTKernelModule("rlt_wifi.ko"));
  EXPECT_EQ(0, utils::RemoveRLTKernelModule("rlt_wifi"));
  auto ins = vorntest::FakeCallsTo("/sbin/insmod");
  ASSERT_EQ(1u, ins.size());
  EXPECT_EQ((std::vector<std::string>{"/lib/modules/rlt_wifi.ko", "mac=00:11:22:33:44:55"}),
            ins[0].argv);
  auto rm = vorntest::FakeCallsTo("/sbin/rmmod");
  ASSERT_EQ(1u, rm.size());
  EXPECT_EQ(std::vector<std::string>{"rlt_wifi"}, rm[0].argv);

  Json::Value s = Scenario();
  s["proc"]["sys/kernel/vorn_mac_address3"] = "0011223344\n";
  ASSERT_TRUE(vorntest::SetRadioScenario(s));
  SyslogCapture log;
  EXPECT_EQ(-1, utils::InsertRLTKernelModule("rlt_wifi.ko"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/utils.cpp", "Bad mac address")));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/utils.cpp", "Failed to get mac")));
  EXPECT_EQ(1u, vorntest::FakeCallsTo("/sbin/insmod").size());
}

TEST_F(WifiUtils, ConnectionListAsJson) {
  utils::ConnectionInfo a;
  a.netif = "wlan0";
  a.hostname = "phone";
  a.ip = std::string("192.168.1.30");
  a.mac = std::string("02:00:00:00:04:01");
  a.asso_time = "00:05:00";
  Json::Value j = utils::ParseConnectionList({a});
  ASSERT_EQ(1u, j.size());
  EXPECT_EQ((std::vector<std::string>{"asso_time", "hostname", "ip", "mac", "netif"}),
            j[0].getMemberNames());
  EXPECT_EQ("02:00:00:00:04:01", j[0]["mac"].asString());
  EXPECT_EQ("192.168.1.30", j[0]["ip"].asString());
  EXPECT_TRUE(utils::ParseConnectionList({}).isArray());
}

TEST_F(WifiUtils, SectionTestAndCipher) {
  SyslogCapture log;
  EXPECT_EQ(-1, utils::IsSectionExist("", "general"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/utils.cpp", "Wrong Parameter.")));
  EXPECT_EQ(0, utils::IsSectionExist("/tmp/no-such-file", "general"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/utils.cpp", "File /tmp/no-such-file doesn't exist")));
  ASSERT_TRUE(WriteFile("/tmp/sections", "[a]\nk=v\n[general]\n"));
  EXPECT_EQ(1, utils::IsSectionExist("/tmp/sections", "general"));
  EXPECT_EQ(0, utils::IsSectionExist("/tmp/sections", "gen"));
  std::string cipher, plain;
  ASSERT_EQ(0, utils::EncryptPlainText("secret \"pw\"", cipher));
  EXPECT_NE(std::string::npos, cipher.find_first_not_of("secret"));
  ASSERT_EQ(0, utils::DecryptCipherText(cipher, plain));
  EXPECT_EQ("secret \"pw\"", plain);
  EXPECT_EQ(-1, utils::DecryptCipherText("garbage", plain));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/utils.cpp", "VLIBCCryptSzDecrypt failed")));
  EXPECT_EQ(-1, utils::EncryptPlainText(std::string(800, 'x'), cipher));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/utils.cpp", "VLIBCCryptSzEncrypt failed")));
}
