// Interface roles, the interface list and the platform actions of link changes and settings.
#include "vornplatform/netif_events.h"

#include <gtest/gtest.h>
#include <net/if.h>
#include <sys/mount.h>
#include <unistd.h>

#include <cstring>
#include <string>
#include <vector>

#include "fixtures/fake_journal.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "vornplatform/err.h"

namespace {

const char kScripts[] = "/etc/sysconfig/network-scripts";
const char kActions[] = "/usr/vorn/libexec/platform";

void Ifcfg(const std::string& ifname, const std::string& content) {
  ASSERT_EQ(vorntest::Run({"/bin/mkdir", "-p", kScripts}).status, 0);
  ASSERT_TRUE(vorntest::WriteFile(std::string(kScripts) + "/ifcfg-" + ifname, content));
}

class NetifEventsTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    vorntest::Run({"/bin/rm", "-rf", kScripts, kActions});
    ASSERT_TRUE(vorntest::ClearFakeJournal());
    ASSERT_TRUE(vorntest::WriteFakeReplies(Json::Value(Json::objectValue)));
    VLIBCErrClear();
  }
  void TearDown() override {
    vorntest::Run({"/bin/rm", "-rf", kScripts, kActions});
    vorntest::Run({"/usr/sbin/ip", "link", "del", "br9"});
    std::string why;
    vorntest::SetPeerLink("eth0", true, &why);
  }
};

// --- bonding ---------------------------------------------------------------------------------

TEST_F(NetifEventsTest, BondingPassiveFollowsTheSlaveState) {
  EXPECT_EQ(VORNNetIfIsBondingPassive("eth0"), 0);  // not a bond member
  EXPECT_EQ(VORNNetIfIsBondingPassive("nosuch0"), 0);
  EXPECT_EQ(VORNNetIfIsBondingPassive(""), 0);
  EXPECT_EQ(VORNNetIfIsBondingPassive(nullptr), 0);
  EXPECT_EQ(VORNNetIfIsBondingPassive("../eth0"), 0);

  // No bonding driver here: give eth0's sysfs directory a bonding_slave/state of our own.
  char target[256] = "";
  ASSERT_GT(readlink("/sys/class/net/eth0", target, sizeof target - 1), 0);
  const std::string dir = std::string("/sys/class/net/") + target;
  ASSERT_EQ(mount("tmpfs", dir.c_str(), "tmpfs", 0, "mode=0755"), 0) << std::strerror(errno);
  ASSERT_EQ(mkdir((dir + "/bonding_slave").c_str(), 0755), 0);
  ASSERT_TRUE(vorntest::WriteFile(dir + "/bonding_slave/state", "backup\n"));
  EXPECT_EQ(VORNNetIfIsBondingPassive("eth0"), 1);
  ASSERT_TRUE(vorntest::WriteFile(dir + "/bonding_slave/state", "active\n"));
  EXPECT_EQ(VORNNetIfIsBondingPassive("eth0"), 0);
  ASSERT_EQ(umount(dir.c_str()), 0);
  EXPECT_EQ(VORNNetIfIsBondingPassive("eth0"), 0);
}

// --- OVS bond ---------------------------------------------------------------------------------

TEST_F(NetifEventsTest, OVSSlaveNeedsMasterAndItsSlaveList) {
  EXPECT_EQ(VLIBNetOVSIfIsSlave("eth0"), 0);  // no ifcfg file at all
  Ifcfg("eth0", "DEVICE=eth0\nMASTER=ovs_bond0\nSLAVE=yes\n");
  EXPECT_EQ(VLIBNetOVSIfIsSlave("eth0"), 0);  // the master's file is missing
  Ifcfg("ovs_bond0", "DEVICE=ovs_bond0\nSLAVE_LIST=\"eth1 eth2\"\n");
  EXPECT_EQ(VLIBNetOVSIfIsSlave("eth0"), 0);  // not in the list
  Ifcfg("ovs_bond0", "DEVICE=ovs_bond0\nSLAVE_LIST=\"eth1  eth0\"\n");
  EXPECT_EQ(VLIBNetOVSIfIsSlave("eth0"), 1);
  EXPECT_EQ(VLIBNetOVSIfIsSlave("eth"), 0);  // a prefix of a member is no member
  Ifcfg("eth0", "DEVICE=eth0\nSLAVE=yes\n");
  EXPECT_EQ(VLIBNetOVSIfIsSlave("eth0"), 0);  // no MASTER
  EXPECT_EQ(VLIBNetOVSIfIsSlave(nullptr), 0);
  EXPECT_EQ(VLIBNetOVSIfIsSlave(""), 0);
}

TEST_F(NetifEventsTest, OVSMasterHasANonEmptySlaveList) {
  EXPECT_EQ(VLIBNetOVSIfIsMaster("ovs_bond0"), 0);
  Ifcfg("ovs_bond0", "DEVICE=ovs_bond0\nSLAVE_LIST=\n");
  EXPECT_EQ(VLIBNetOVSIfIsMaster("ovs_bond0"), 0);
  Ifcfg("ovs_bond0", "DEVICE=ovs_bond0\nSLAVE_LIST=\"  \"\n");
  EXPECT_EQ(VLIBNetOVSIfIsMaster("ovs_bond0"), 0);
  Ifcfg("ovs_bond0", "DEVICE=ovs_bond0\nSLAVE_LIST=eth0\n");
  EXPECT_EQ(VLIBNetOVSIfIsMaster("ovs_bond0"), 1);
  EXPECT_EQ(VLIBNetOVSIfIsMaster("eth0"), 0);
  EXPECT_EQ(VLIBNetOVSIfIsMaster(nullptr), 0);
}

// --- bridge port, DHCP ---------------------------------------------------------------------------

TEST_F(NetifEventsTest, BridgePortOfARealBridge) {
  EXPECT_EQ(VLIBNetBridgeIfIsSlave("eth0"), 0);
  vorntest::IpOk({"link", "add", "br9", "type", "bridge"});
  vorntest::IpOk({"link", "set", "eth0", "master", "br9"});
  EXPECT_EQ(VLIBNetBridgeIfIsSlave("eth0"), 1);
  EXPECT_EQ(VLIBNetBridgeIfIsSlave("br9"), 0);  // the bridge is not its own port
  vorntest::IpOk({"link", "set", "eth0", "nomaster"});
  EXPECT_EQ(VLIBNetBridgeIfIsSlave("eth0"), 0);
  EXPECT_EQ(VLIBNetBridgeIfIsSlave("nosuch0"), 0);
  EXPECT_EQ(VLIBNetBridgeIfIsSlave(nullptr), 0);
  // eth0 got its address back? A port keeps its addresses; make sure we did not lose it.
  auto r = vorntest::Run({"/usr/sbin/ip", "-4", "addr", "show", "dev", "eth0"});
  EXPECT_NE(r.out.find("10.200.1.2/24"), std::string::npos) << r.out;
}

TEST_F(NetifEventsTest, DHCPFromBootproto) {
  EXPECT_EQ(BlVORNLnxIsDHCP("eth0"), 0);  // no file
  Ifcfg("eth0", "DEVICE=eth0\nBOOTPROTO=dhcp\n");
  EXPECT_NE(BlVORNLnxIsDHCP("eth0"), 0);
  EXPECT_NE(BlVORNLnxIsDHCP_S("eth0"), 0);
  Ifcfg("eth0", "DEVICE=eth0\nBOOTPROTO=\"dhcp\"\n");
  EXPECT_NE(BlVORNLnxIsDHCP_S("eth0"), 0);
  Ifcfg("eth0", "DEVICE=eth0\nBOOTPROTO=static\nIPADDR=10.200.1.2\n");
  EXPECT_EQ(BlVORNLnxIsDHCP("eth0"), 0);
  EXPECT_EQ(BlVORNLnxIsDHCP_S("eth0"), 0);
  Ifcfg("eth0", "DEVICE=eth0\nBOOTPROTO=dhcpx\n");
  EXPECT_EQ(BlVORNLnxIsDHCP("eth0"), 0);
  EXPECT_EQ(BlVORNLnxIsDHCP(nullptr), 0);
  EXPECT_EQ(BlVORNLnxIsDHCP_S(""), 0);
}

// --- interface list ----------------------------------------------------------------------------

const VLIB_NET_IF_INFO* FindRecord(const std::vector<VLIB_NET_IF_INFO>& records, int count,
                                   const char* name) {
  for (int i = 0; i < count; ++i) {
    if (std::strcmp(records[i].szIfName, name) == 0) return &records[i];
  }
  return nullptr;
}

TEST_F(NetifEventsTest, InterfaceListHasNameAddressAndStatus) {
  vorntest::IpOk({"link", "add", "br9", "type", "bridge"});  // down, no address
  std::vector<VLIB_NET_IF_INFO> records(32);
  int count = VLIBNetGetInterfaceInfo(records.data(), 32, 3);
  ASSERT_GE(count, 2);
  EXPECT_EQ(FindRecord(records, count, "lo"), nullptr);
  const VLIB_NET_IF_INFO* eth0 = FindRecord(records, count, "eth0");
  ASSERT_NE(eth0, nullptr);
  EXPECT_STREQ(eth0->szIP, "10.200.1.2");
  EXPECT_EQ(eth0->iStatus, 2);
  EXPECT_NE(eth0->uFlags & IFF_RUNNING, 0u);
  const VLIB_NET_IF_INFO* br9 = FindRecord(records, count, "br9");
  ASSERT_NE(br9, nullptr);
  EXPECT_STREQ(br9->szIP, "");
  EXPECT_EQ(br9->iStatus, VLIB_NET_IF_STATUS_DOWN);

  std::string why;
  ASSERT_TRUE(vorntest::SetPeerLink("eth0", false, &why)) << why;
  count = VLIBNetGetInterfaceInfo(records.data(), 32, 3);
  eth0 = FindRecord(records, count, "eth0");
  ASSERT_NE(eth0, nullptr);
  EXPECT_NE(eth0->iStatus, 2);  // up but without carrier
  EXPECT_STREQ(eth0->szIP, "10.200.1.2");
}

TEST_F(NetifEventsTest, InterfaceListKindsAndCapacity) {
  vorntest::IpOk({"link", "add", "br9", "type", "bridge"});
  std::vector<VLIB_NET_IF_INFO> records(32);
  // veth and bridge are virtual: there is no device behind them.
  EXPECT_EQ(VLIBNetGetInterfaceInfo(records.data(), 32, VLIB_NET_IF_KIND_PHYSICAL), 0);
  const int all = VLIBNetGetInterfaceInfo(records.data(), 32, VLIB_NET_IF_KIND_VIRTUAL);
  EXPECT_GE(all, 2);

  vorntest::SyslogCapture log;
  std::vector<VLIB_NET_IF_INFO> one(2);
  std::memset(&one[1], 0x5a, sizeof one[1]);
  EXPECT_EQ(VLIBNetGetInterfaceInfo(one.data(), 1, 3), 1);
  EXPECT_EQ(reinterpret_cast<unsigned char*>(&one[1])[0], 0x5a);  // nothing beyond capacity
  EXPECT_EQ(log.Matching(" interfaces left out of a list of 1").size(), 1u) << log.Dump();

  EXPECT_EQ(VLIBNetGetInterfaceInfo(nullptr, 32, 3), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_BAD_PARAMETER);
  EXPECT_EQ(VLIBNetGetInterfaceInfo(records.data(), 0, 3), -1);
  EXPECT_EQ(VLIBNetGetInterfaceInfo(records.data(), 32, 0), -1);
  EXPECT_EQ(VLIBNetGetInterfaceInfo(records.data(), 32, 4), -1);
}

// --- link events ---------------------------------------------------------------------------------

TEST_F(NetifEventsTest, LinkEventsRunTheirActions) {
  // Without an action the reaction is a successful no-op.
  EXPECT_EQ(vornnetsdk::sdk_s::VLIBNetIfLinkUpEvent_S("eth0"), 0);
  EXPECT_EQ(vornnetsdk::sdk_s::VLIBNetIfLinkDownEvent_S("eth0"), 0);

  const std::string up = std::string(kActions) + "/VLIBNetIfLinkUpEvent";
  const std::string down = std::string(kActions) + "/VLIBNetIfLinkDownEvent";
  ASSERT_TRUE(vorntest::InstallFake(up));
  ASSERT_TRUE(vorntest::InstallFake(down));
  EXPECT_EQ(vornnetsdk::sdk_s::VLIBNetIfLinkUpEvent_S("eth0"), 0);
  EXPECT_EQ(vornnetsdk::sdk_s::VLIBNetIfLinkDownEvent_S("wlan1"), 0);
  auto ups = vorntest::FakeCallsTo(up);
  ASSERT_EQ(ups.size(), 1u);
  EXPECT_EQ(ups[0].argv, std::vector<std::string>{"eth0"});
  auto downs = vorntest::FakeCallsTo(down);
  ASSERT_EQ(downs.size(), 1u);
  EXPECT_EQ(downs[0].argv, std::vector<std::string>{"wlan1"});

  Json::Value failing;
  failing["exit"] = 3;
  ASSERT_TRUE(vorntest::AddFakeReply(up, failing));
  vorntest::SyslogCapture log;
  EXPECT_EQ(vornnetsdk::sdk_s::VLIBNetIfLinkUpEvent_S("eth0"), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_EXEC);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, "platform action VLIBNetIfLinkUpEvent exited with 3"))
      << log.Dump();

  ASSERT_TRUE(vorntest::ClearFakeJournal());
  EXPECT_EQ(vornnetsdk::sdk_s::VLIBNetIfLinkDownEvent_S(nullptr), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_BAD_PARAMETER);
  EXPECT_EQ(vornnetsdk::sdk_s::VLIBNetIfLinkDownEvent_S(""), -1);
  EXPECT_EQ(vornnetsdk::sdk_s::VLIBNetIfLinkDownEvent_S("a/b"), -1);
  EXPECT_EQ(vornnetsdk::sdk_s::VLIBNetIfLinkDownEvent_S("abcdefghijklmnopq"), -1);
  EXPECT_TRUE(vorntest::ReadFakeJournal().empty());
}

// --- settings back to the platform ---------------------------------------------------------------

TEST_F(NetifEventsTest, SetCard1HandsTheInfoRecordOver) {
  VORN_NETIF_INFO info;
  ASSERT_EQ(VORNNetIFGetInfo_S("eth0", &info), 0);
  EXPECT_EQ(VORNNetSetCard1_S(&info), 0);  // no action installed

  const std::string action = std::string(kActions) + "/VORNNetSetCard1";
  ASSERT_TRUE(vorntest::InstallFake(action));
  EXPECT_EQ(VORNNetSetCard1_S(&info), 0);
  Ifcfg("eth0", "DEVICE=eth0\nBOOTPROTO=dhcp\n");
  ASSERT_EQ(VORNNetIFGetInfo_S("eth0", &info), 0);
  EXPECT_EQ(VORNNetSetCard1_S(&info), 0);
  auto calls = vorntest::FakeCallsTo(action);
  ASSERT_EQ(calls.size(), 2u);
  EXPECT_EQ(calls[0].argv,
            (std::vector<std::string>{"eth0", "1", "10.200.1.2", "255.255.255.0"}));
  EXPECT_EQ(calls[1].argv,
            (std::vector<std::string>{"eth0", "0", "10.200.1.2", "255.255.255.0"}));

  Json::Value failing;
  failing["exit"] = 1;
  ASSERT_TRUE(vorntest::AddFakeReply(action, failing));
  EXPECT_EQ(VORNNetSetCard1_S(&info), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_EXEC);

  EXPECT_EQ(VORNNetSetCard1_S(nullptr), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_BAD_PARAMETER);
  VORN_NETIF_INFO bad;
  std::memset(&bad, 'x', sizeof bad);  // no terminator anywhere
  EXPECT_EQ(VORNNetSetCard1_S(&bad), -1);
  std::memset(&bad, 0, sizeof bad);
  EXPECT_EQ(VORNNetSetCard1_S(&bad), -1);  // no name
  EXPECT_EQ(vorntest::FakeCallsTo(action).size(), 3u);
}

}  // namespace
