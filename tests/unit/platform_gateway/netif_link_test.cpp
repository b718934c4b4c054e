// Link state of a veth whose peer goes down and up, and of an OVS bond master.
#include "vornplatform/netif_link.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>

#include "support/test_util.h"
#include "vornplatform/err.h"

namespace {

void SetPeer(bool up) {
  std::string why;
  ASSERT_TRUE(vorntest::SetPeerLink("eth0", up, &why)) << why;
}

const char kIfcfgDir[] = "/etc/sysconfig/network-scripts";

}  // namespace

TEST(VORNNetIfIsLink, FollowsThePeer) {
  EXPECT_EQ(VORNNetIfIsLink("eth0"), 1);
  SetPeer(false);
  EXPECT_EQ(VORNNetIfIsLink("eth0"), 0);
  SetPeer(true);
  EXPECT_EQ(VORNNetIfIsLink("eth0"), 1);
}

TEST(VORNNetIfIsLink, AdministrativelyDownHasNoLink) {
  ASSERT_EQ(vorntest::Run({"/sbin/ip", "link", "set", "eth0", "down"}).status, 0);
  EXPECT_EQ(VORNNetIfIsLink("eth0"), 0);
  ASSERT_EQ(vorntest::Run({"/sbin/ip", "link", "set", "eth0", "up"}).status, 0);
}

TEST(VORNNetIfIsLink, MissingInterfaceAndBadNames) {
  VLIBCErrClear();
  EXPECT_EQ(VORNNetIfIsLink("nosuch0"), -1);
  EXPECT_EQ(VLIBCErrGet(), 0x300);
  for (const char* bad : {"", "..", "eth0/../eth0", "averyveryverylongname0"}) {
    VLIBCErrClear();
    EXPECT_EQ(VORNNetIfIsLink(bad), -1) << bad;
    EXPECT_EQ(VLIBCErrGet(), 0xd00) << bad;
  }
  EXPECT_EQ(VORNNetIfIsLink(nullptr), -1);
}

TEST(VORNNetIfIsLink, OvsBondMasterHasLinkWhenAMemberHas) {
  ASSERT_EQ(vorntest::Run({"/bin/mkdir", "-p", kIfcfgDir}).status, 0);
  ASSERT_TRUE(vorntest::WriteFile(std::string(kIfcfgDir) + "/ifcfg-bond0",
                                  "DEVICE=bond0\nSLAVE_LIST=\"nosuch1 eth0\"\n"));
  EXPECT_EQ(VORNNetIfIsLink("bond0"), 1);
  SetPeer(false);
  EXPECT_EQ(VORNNetIfIsLink("bond0"), 0);
  SetPeer(true);
  ASSERT_TRUE(vorntest::WriteFile(std::string(kIfcfgDir) + "/ifcfg-bond0",
                                  "DEVICE=bond0\nSLAVE_LIST=\"nosuch1 nosuch2\"\n"));
  EXPECT_EQ(VORNNetIfIsLink("bond0"), 0);
  unlink((std::string(kIfcfgDir) + "/ifcfg-bond0").c_str());
  EXPECT_EQ(VORNNetIfIsLink("bond0"), -1);
}
