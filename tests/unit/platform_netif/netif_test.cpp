// Interface facts on a veth whose peer goes down and up, with and without an ifcfg file.
#include "vornplatform/netif.h"

#include <gtest/gtest.h>
#include <net/if.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>

#include "support/test_util.h"

namespace {

void Ip(std::vector<std::string> args) {
  args.insert(args.begin(), "/usr/sbin/ip");
  auto r = vorntest::Run(args);
  ASSERT_EQ(r.status, 0) << r.err;
}

void SetPeer(bool up) {
  std::string why;
  ASSERT_TRUE(vorntest::SetPeerLink("eth0", up, &why)) << why;
}

const char kIfcfg[] = "/etc/sysconfig/network-scripts/ifcfg-eth0";

}  // namespace

TEST(VORNNetIFGetInfo, LiveRecordOfAVeth) {
  Ip({"link", "set", "eth0", "address", "02:00:00:aa:bb:01"});
  VORN_NETIF_INFO info;
  ASSERT_EQ(VORNNetIFGetInfo("eth0", &info, nullptr), 1);
  EXPECT_STREQ(info.szIfName, "eth0");
  EXPECT_STREQ(info.szIP, "10.200.1.2");
  EXPECT_STREQ(info.szMask, "255.255.255.0");
  EXPECT_NE(info.uFlags & IFF_UP, 0u);
  EXPECT_EQ(info.uFlags & 1u, 1u);
  EXPECT_EQ(info.iLink, 1);
  const unsigned char mac[6] = {0x02, 0, 0, 0xaa, 0xbb, 0x01};
  EXPECT_EQ(std::memcmp(info.mac, mac, 6), 0);
  EXPECT_EQ(info.iFlag, VORN_NETIF_STATIC);  // no ifcfg file
}

TEST(VORNNetIFGetInfo, LinkFollowsThePeer) {
  SetPeer(false);
  VORN_NETIF_INFO info;
  EXPECT_EQ(VORNNetIFGetInfo("eth0", &info, nullptr), 1);
  EXPECT_EQ(info.iLink, 0);
  EXPECT_NE(info.uFlags & IFF_UP, 0u);
  SetPeer(true);
  EXPECT_EQ(VORNNetIFGetInfo("eth0", &info, nullptr), 1);
  EXPECT_EQ(info.iLink, 1);
}

TEST(VORNNetIFGetInfo, DownInterfaceWithoutAddress) {
  Ip({"link", "add", "vtest0", "type", "veth", "peer", "name", "vtest1"});
  VORN_NETIF_INFO info;
  EXPECT_EQ(VORNNetIFGetInfo("vtest0", &info, nullptr), 1);
  EXPECT_STREQ(info.szIP, "");
  EXPECT_STREQ(info.szMask, "");
  EXPECT_EQ(info.uFlags & IFF_UP, 0u);
  EXPECT_EQ(info.iLink, 0);
  Ip({"link", "del", "vtest0"});
}

TEST(VORNNetIFGetInfo, SecondRecordHoldsTheConfiguredAddress) {
  vorntest::Run({"/usr/bin/mkdir", "-p", "/etc/sysconfig/network-scripts"});
  ASSERT_TRUE(vorntest::WriteFile(kIfcfg, "DEVICE=eth0\nBOOTPROTO=dhcp\nIPADDR=192.168.9.9\n"
                                          "NETMASK=255.255.0.0\n"));
  VORN_NETIF_INFO live, conf;
  ASSERT_EQ(VORNNetIFGetInfo("eth0", &live, &conf), 1);
  EXPECT_EQ(live.iFlag, VORN_NETIF_DHCP);
  EXPECT_STREQ(live.szIP, "10.200.1.2");
  EXPECT_STREQ(conf.szIP, "192.168.9.9");
  EXPECT_STREQ(conf.szMask, "255.255.0.0");
  EXPECT_STREQ(conf.szIfName, "eth0");
  EXPECT_EQ(conf.iFlag, VORN_NETIF_DHCP);
  ASSERT_TRUE(vorntest::WriteFile(kIfcfg, "BOOTPROTO=static\n"));
  ASSERT_EQ(VORNNetIFGetInfo("eth0", &live, &conf), 1);
  EXPECT_EQ(live.iFlag, VORN_NETIF_STATIC);
  EXPECT_STREQ(conf.szIP, "");
  unlink(kIfcfg);
}

TEST(VORNNetIFGetInfo, MissingInterfaceAndBadParameters) {
  VORN_NETIF_INFO info, info2;
  std::memset(&info, 0x55, sizeof(info));
  std::memset(&info2, 0x55, sizeof(info2));
  EXPECT_EQ(VORNNetIFGetInfo("nosuch0", &info, &info2), 0);
  EXPECT_EQ(info.szIfName[0], '\0');
  EXPECT_EQ(info2.szIP[0], '\0');
  EXPECT_EQ(VORNNetIFGetInfo(nullptr, &info, nullptr), -1);
  EXPECT_EQ(VORNNetIFGetInfo("eth0", nullptr, nullptr), -1);
  EXPECT_EQ(VORNNetIFGetInfo("a-name-much-too-long", &info, nullptr), -1);
  EXPECT_EQ(VORNNetIFGetInfo("", &info, nullptr), -1);
}

TEST(VORNNetIFGetInfo_S, SuccessIsZeroMissingIsNegative) {
  VORN_NETIF_INFO info;
  EXPECT_EQ(VORNNetIFGetInfo_S("eth0", &info), 0);
  EXPECT_STREQ(info.szIP, "10.200.1.2");
  EXPECT_LT(VORNNetIFGetInfo_S("nosuch0", &info), 0);
  EXPECT_LT(VORNNetIFGetInfo_S(nullptr, &info), 0);
  EXPECT_LT(VORNNetIFGetInfo_S("eth0", nullptr), 0);
}
