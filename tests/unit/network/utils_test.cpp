// Network helpers: subnet text, the Ethernet link through the real ethtool on a veth whose peer
// goes down and up, and the gateway filter.
#include "vornwireless/network/utils.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>
#include <string>

#include "fixtures/fake_journal.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"

using vornnetwork::network::FilterList;
using vornnetwork::network::GetSubnetFormat;
using vornnetwork::network::IsEthernetLinkDetected;
using vorntest::LogLine;
using vorntest::SyslogCapture;

namespace {

const char kFile[] = "network/utils.cpp";
const char kEthtool[] = "/usr/bin/ethtool";

void SetPeer(bool up) {
  std::string why;
  ASSERT_TRUE(vorntest::SetPeerLink("eth0", up, &why)) << why;
}

Json::Value Record(std::string const& ifname, std::string const& klass,
                   std::string const& gateway, bool slave = false) {
  Json::Value r(Json::objectValue);
  r["ifname"] = ifname;
  r["class"] = klass;
  r["gateway"] = gateway;
  r["slave"] = slave;
  r["priority"] = 1;
  return r;
}

std::string Names(Json::Value const& list) {
  std::string out;
  for (auto const& r : list) out += r["ifname"].asString() + ",";
  return out;
}

// Puts the recording fake at /usr/bin/ethtool for one test and the real program back after it.
class FakeEthtool : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InstallFake(kEthtool));
    vorntest::ClearFakeJournal();
  }
  void TearDown() override {
    unlink(kEthtool);
    ASSERT_EQ(symlink("/usr/sbin/ethtool", kEthtool), 0);
  }
};

class PeerLink : public ::testing::Test {
 protected:
  void TearDown() override { SetPeer(true); }
};

}  // namespace

TEST(GetSubnetFormat, DottedMaskGivesNetworkAndPrefix) {
  std::string out = "old";
  EXPECT_EQ(GetSubnetFormat("192.168.1.77", "255.255.255.0", out), 0);
  EXPECT_EQ(out, "192.168.1.0/24");
  EXPECT_EQ(GetSubnetFormat("10.1.2.3", "255.0.0.0", out), 0);
  EXPECT_EQ(out, "10.0.0.0/8");
  EXPECT_EQ(GetSubnetFormat("10.1.2.3", "16", out), 0);
  EXPECT_EQ(out, "10.1.0.0/16");
}

TEST(GetSubnetFormat, BadInputFailsAndKeepsOut) {
  for (auto const& pair : {std::make_pair("nonsense", "255.255.255.0"),
                           std::make_pair("192.168.1.1", "255.0.255.0"),
                           std::make_pair("192.168.1.1", ""), std::make_pair("", "")}) {
    SyslogCapture log;
    std::string out = "old";
    EXPECT_EQ(GetSubnetFormat(pair.first, pair.second, out), -1) << pair.first;
    EXPECT_EQ(out, "old");
    EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to translate to ip/mask format to a "
                                                    "subnet format.")))
        << log.Dump();
  }
  std::string out;
  EXPECT_EQ(GetSubnetFormat(std::string(3000, '1'), "24", out), -1);
}

TEST_F(PeerLink, EthtoolSeesTheLinkOfTheVeth) {
  ASSERT_EQ(vorntest::ReadFile("/sys/class/net/eth0/carrier"), "1\n");
  EXPECT_TRUE(IsEthernetLinkDetected("eth0"));
  SetPeer(false);
  EXPECT_FALSE(IsEthernetLinkDetected("eth0"));
  SetPeer(true);
  EXPECT_TRUE(IsEthernetLinkDetected("eth0"));
}

TEST_F(PeerLink, FilterKeepsEthernetOnlyWithLink) {
  Json::Value list(Json::arrayValue);
  list.append(Record("eth0", "ethernet", "10.200.1.1"));
  list.append(Record("eth1", "lan", ""));
  Json::Value all = list;
  EXPECT_EQ(FilterList("all", all), 0);
  EXPECT_EQ(Names(all), "eth0,eth1,");

  SetPeer(false);
  all = list;
  EXPECT_EQ(FilterList("all", all), 0);
  EXPECT_EQ(Names(all), "eth1,");
  Json::Value lan = list;
  EXPECT_EQ(FilterList("lan", lan), 0);
  EXPECT_EQ(Names(lan), "eth1,");
  Json::Value ethernet = list;
  EXPECT_EQ(FilterList("ethernet", ethernet), 0);
  EXPECT_EQ(Names(ethernet), "");
}

TEST(IsEthernetLinkDetected, MissingProgramIsNoLink) {
  ASSERT_EQ(rename(kEthtool, "/usr/bin/ethtool.away"), 0);
  SyslogCapture log;
  bool detected = IsEthernetLinkDetected("eth0");
  ASSERT_EQ(rename("/usr/bin/ethtool.away", kEthtool), 0);
  EXPECT_FALSE(detected);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to execute cmd [/usr/bin/ethtool]")))
      << log.Dump();
}

TEST_F(FakeEthtool, RunsEthtoolWithTheNameAndReadsTheLinkLine) {
  Json::Value reply(Json::objectValue);
  reply["args"] = Json::Value(Json::arrayValue);
  reply["args"].append("eth7");
  reply["stdout"] = "Settings for eth7:\n\tSpeed: 1000Mb/s\n\tLink detected: no\n\tExtra: yes\n";
  ASSERT_TRUE(vorntest::AddFakeReply(kEthtool, reply));
  EXPECT_FALSE(IsEthernetLinkDetected("eth7"));
  auto calls = vorntest::FakeCallsTo(kEthtool);
  ASSERT_EQ(calls.size(), 1u);
  EXPECT_EQ(calls[0].argv, (std::vector<std::string>{"eth7"}));

  reply["args"][0] = "eth8";
  reply["stdout"] = "Settings for eth8:\n\tLink detected:   yes  \n";
  ASSERT_TRUE(vorntest::AddFakeReply(kEthtool, reply));
  EXPECT_TRUE(IsEthernetLinkDetected("eth8"));
}

TEST_F(FakeEthtool, NoOutputIsNoLink) {
  EXPECT_FALSE(IsEthernetLinkDetected("eth9"));
  EXPECT_EQ(vorntest::FakeCallsTo(kEthtool).size(), 1u);
}

TEST_F(FakeEthtool, WlanInterfaceIsNeverAskedForItsLink) {
  Json::Value list(Json::arrayValue);
  list.append(Record("wlan0", "ethernet", "192.168.5.1"));
  list.append(Record("eth3", "ethernet", "192.168.6.1"));
  Json::Value reply(Json::objectValue);
  reply["args"] = Json::Value(Json::arrayValue);
  reply["args"].append("eth3");
  reply["stdout"] = "\tLink detected: no\n";
  ASSERT_TRUE(vorntest::AddFakeReply(kEthtool, reply));
  EXPECT_EQ(FilterList("all", list), 0);
  EXPECT_EQ(Names(list), "wlan0,");
  auto calls = vorntest::FakeCallsTo(kEthtool);
  ASSERT_EQ(calls.size(), 1u);
  EXPECT_EQ(calls[0].argv, (std::vector<std::string>{"eth3"}));
}

TEST_F(FakeEthtool, FilterRulesKeepOrder) {
  Json::Value list(Json::arrayValue);
  list.append(Record("ppp0", "wan", "1.2.3.4"));
  list.append(Record("br0", "lan", "192.168.1.1"));
  list.append(Record("usb0", "usbmodem", "5.6.7.8"));
  list.append(Record("bond0", "wan", "9.9.9.9", true));  // slave: never kept
  list.append(Record("eth2", "wan", ""));                // no gateway: not for "wan"
  list.append(Record("br1", "lan", ""));

  Json::Value wan = list;
  FilterList("wan", wan);
  EXPECT_EQ(Names(wan), "ppp0,usb0,");
  Json::Value lan = list;
  FilterList("lan", lan);
  EXPECT_EQ(Names(lan), "br0,br1,");
  Json::Value all = list;
  FilterList("all", all);
  EXPECT_EQ(Names(all), "ppp0,br0,usb0,eth2,br1,");
  Json::Value usb = list;
  FilterList("usbmodem", usb);
  EXPECT_EQ(Names(usb), "usb0,");
  Json::Value none = list;
  FilterList("nothing", none);
  EXPECT_EQ(Names(none), "");
  EXPECT_TRUE(vorntest::FakeCallsTo(kEthtool).empty());
}

TEST_F(FakeEthtool, BadlyTypedRecordsDoNotThrow) {
  Json::Value list(Json::arrayValue);
  list.append(Json::Value(5));
  list.append(Json::Value(Json::arrayValue));
  Json::Value odd(Json::objectValue);
  odd["ifname"] = 3;
  odd["class"] = Json::Value(Json::arrayValue);
  odd["gateway"] = true;
  odd["slave"] = "x";
  list.append(odd);
  list.append(Record("br0", "lan", "192.168.1.1"));
  EXPECT_NO_THROW(EXPECT_EQ(FilterList("lan", list), 0));
  EXPECT_EQ(list.size(), 1u);
  EXPECT_EQ(list[0]["ifname"].asString(), "br0");
  Json::Value notArray(7);
  EXPECT_NO_THROW(EXPECT_EQ(FilterList("all", notArray), 0));
  EXPECT_EQ(notArray, Json::Value(7));
}
