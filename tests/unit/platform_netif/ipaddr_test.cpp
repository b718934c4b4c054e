// Dotted IPv4 helpers: octets and the network/prefix form.
#include "vornplatform/ipaddr.h"

#include <gtest/gtest.h>

#include "vornplatform/err.h"

TEST(cVLIBISepIP, FourOctets) {
  unsigned int o[4] = {9, 9, 9, 9};
  EXPECT_EQ(cVLIBISepIP("192.168.0.255", o), 4);
  EXPECT_EQ(o[0], 192u);
  EXPECT_EQ(o[1], 168u);
  EXPECT_EQ(o[2], 0u);
  EXPECT_EQ(o[3], 255u);
}

TEST(cVLIBISepIP, CountsPartsAndRefusesBadOnes) {
  unsigned int o[4];
  EXPECT_EQ(cVLIBISepIP("10.1.2", o), 3);
  EXPECT_EQ(cVLIBISepIP("1.2.3.4.5", o), 5);
  EXPECT_EQ(cVLIBISepIP("1.2.3.256", o), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_FORMAT);
  EXPECT_EQ(cVLIBISepIP("1..3.4", o), -1);
  EXPECT_EQ(cVLIBISepIP("1.2.3.4 ", o), -1);
  EXPECT_EQ(cVLIBISepIP("", o), -1);
  EXPECT_EQ(cVLIBISepIP("fe80::1", o), -1);
  EXPECT_EQ(cVLIBISepIP("1234.1.1.1", o), -1);
  EXPECT_EQ(cVLIBISepIP(nullptr, o), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_BAD_PARAMETER);
  EXPECT_EQ(cVLIBISepIP("1.2.3.4", nullptr), -1);
}

TEST(ErrVLIBIpMaskToSubnet, DottedMaskOrPrefix) {
  char out[64];
  EXPECT_EQ(ErrVLIBIpMaskToSubnet("192.168.1.77/255.255.255.0", out), 0);
  EXPECT_STREQ(out, "192.168.1.0/24");
  EXPECT_EQ(ErrVLIBIpMaskToSubnet("172.16.5.4/255.240.0.0", out), 0);
  EXPECT_STREQ(out, "172.16.0.0/12");
  EXPECT_EQ(ErrVLIBIpMaskToSubnet("10.9.8.7/0.0.0.0", out), 0);
  EXPECT_STREQ(out, "0.0.0.0/0");
  EXPECT_EQ(ErrVLIBIpMaskToSubnet("10.9.8.7/32", out), 0);
  EXPECT_STREQ(out, "10.9.8.7/32");
  EXPECT_EQ(ErrVLIBIpMaskToSubnet("10.9.8.7/17", out), 0);
  EXPECT_STREQ(out, "10.9.0.0/17");
  EXPECT_EQ(ErrVLIBIpMaskToSubnet("10.9.200.7/17", out), 0);
  EXPECT_STREQ(out, "10.9.128.0/17");
}

TEST(ErrVLIBIpMaskToSubnet, BadInput) {
  char out[64] = "x";
  for (const char* bad : {"192.168.1.1", "192.168.1.1/", "192.168.1.1/33", "192.168.1.1/255.0.255.0",
                          "nonsense/24", "192.168.1.1/abc", "/24", "192.168.1.1/-1"}) {
    EXPECT_EQ(ErrVLIBIpMaskToSubnet(bad, out), -1) << bad;
    EXPECT_STREQ(out, "") << bad;
  }
  EXPECT_EQ(ErrVLIBIpMaskToSubnet(nullptr, out), -1);
  EXPECT_EQ(ErrVLIBIpMaskToSubnet("1.2.3.4/8", nullptr), -1);
}
