// Router records: the bytes of the file, reading it back, the JSON form and the LAN list.
#include "vornwireless/ipv6router/router6_attr.h"

#include <gtest/gtest.h>

#include "ipv6router_test_support.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"

namespace {

using vorn::network::ipv6::router::Router6Attr;
using vorntest::ReadFile;

class Router6AttrTest : public testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    ipv6routertest::CleanDirs();
  }
};

TEST_F(Router6AttrTest, SaveWritesThreeSectionsByteForByte) {
  Router6Attr attr("6in4", "eth0", "2001:db8:100::/48", "203.0.113.5", "198.51.100.1",
                   "2001:db8:ffff::2/64", true);
  attr.AddLan("2001:db8:100::", "lbr0");
  attr.AddLan("2001:db8:101::", "lbr1");
  ASSERT_EQ(0, attr.SaveConfig());
  EXPECT_EQ(
      "[conf]\n"
      "\ttype=6in4\n"
      "\twan=eth0\n"
      "\tprefix=2001:db8:100::/48\n"
      "\tis_default_gateway=yes\n"
      "[addr]\n"
      "\tlocal_addr_v4=203.0.113.5\n"
      "\tremote_addr_v4=198.51.100.1\n"
      "\tlocal_addr_v6=2001:db8:ffff::2/64\n"
      "[lan]\n"
      "\t2001:db8:100::=lbr0\n"
      "\t2001:db8:101::=lbr1\n",
      ipv6routertest::Record("eth0"));
}

TEST_F(Router6AttrTest, NativeRecordKeepsEmptyValuesAndAnEmptyLanSection) {
  Router6Attr attr("eth1", false);
  ASSERT_EQ(0, attr.SaveConfig());
  EXPECT_EQ(
      "[conf]\n\ttype=native\n\twan=eth1\n\tprefix=\n\tis_default_gateway=no\n"
      "[addr]\n\tlocal_addr_v4=\n\tremote_addr_v4=\n\tlocal_addr_v6=\n"
      "[lan]\n",
      ipv6routertest::Record("eth1"));
}

TEST_F(Router6AttrTest, SaveReplacesTheWholeFile) {
  Router6Attr attr("6to4", "eth0", "2002:cb00:7105::/48", "203.0.113.5", "192.88.99.1",
                   "2002:cb00:7105::1/16", false);
  attr.AddLan("2002:cb00:7105::", "lbr0");
  ASSERT_EQ(0, attr.SaveConfig());
  attr.RemoveLan("2002:cb00:7105::", "lbr0");
  ASSERT_EQ(0, attr.SaveConfig());
  EXPECT_EQ(
      "[conf]\n\ttype=6to4\n\twan=eth0\n\tprefix=2002:cb00:7105::/48\n"
      "\tis_default_gateway=no\n"
      "[addr]\n\tlocal_addr_v4=203.0.113.5\n\tremote_addr_v4=192.88.99.1\n"
      "\tlocal_addr_v6=2002:cb00:7105::1/16\n"
      "[lan]\n",
      ipv6routertest::Record("eth0"));
}

TEST_F(Router6AttrTest, LoadReadsBackWhatSaveWrote) {
  Router6Attr saved("6in4", "eth0", "2001:db8:100::/48", "203.0.113.5", "198.51.100.1",
                    "2001:db8:ffff::2/64", true);
  saved.AddLan("2001:db8:100::", "lbr0");
  ASSERT_EQ(0, saved.SaveConfig());
  Router6Attr loaded;
  loaded.wan = "eth0";
  ASSERT_EQ(0, loaded.LoadConfig());
  EXPECT_TRUE(loaded == saved);
  ASSERT_EQ(1u, loaded.lans.size());
  EXPECT_EQ("2001:db8:100::", loaded.lans[0].first);
  EXPECT_EQ("lbr0", loaded.lans[0].second);
}

TEST_F(Router6AttrTest, IsDefaultGatewayNoLoadsAsTrueWithoutTheGatewayDatabase) {
  ASSERT_TRUE(vorntest::WriteFile(ipv6routertest::kRecordDir + "/ipv6-eth0",
                                  "[conf]\n\ttype=native\n\twan=eth0\n\tprefix=\n"
                                  "\tis_default_gateway=no\n[addr]\n[lan]\n"));
  Router6Attr attr;
  attr.wan = "eth0";
  ASSERT_EQ(0, attr.LoadConfig());
  EXPECT_TRUE(attr.is_default_gateway);
  EXPECT_EQ("native", attr.type);
}

TEST_F(Router6AttrTest, MissingKeysOnlyLogAndAMissingFileFails) {
  vorntest::SyslogCapture log;
  Router6Attr none;
  none.wan = "eth0";
  EXPECT_EQ(-1, none.LoadConfig());
  EXPECT_TRUE(log.HasOnce(LOG_INFO, vorntest::LogLine("ipv6router/router6_attr.cpp",
                                                      "No existing IPv6 config")))
      << log.Dump();
  ASSERT_TRUE(vorntest::WriteFile(ipv6routertest::kRecordDir + "/ipv6-eth0",
                                  "[conf]\n\ttype=6in4\n\twan=eth0\n[addr]\n[lan]\n"));
  log.Clear();
  Router6Attr attr;
  attr.wan = "eth0";
  EXPECT_EQ(0, attr.LoadConfig());
  EXPECT_EQ("6in4", attr.type);
  EXPECT_FALSE(attr.is_default_gateway);
  // prefix, local_addr_v4, remote_addr_v4, local_addr_v6
  EXPECT_EQ(4u, log.Matching("Failed to get config section").size()) << log.Dump();
}

TEST_F(Router6AttrTest, RemoveConfigOfAMissingFileFails) {
  Router6Attr attr("eth0", false);
  EXPECT_EQ(-1, attr.RemoveConfig());
  ASSERT_EQ(0, attr.SaveConfig());
  EXPECT_EQ(0, attr.RemoveConfig());
  EXPECT_FALSE(vorntest::Exists(ipv6routertest::kRecordDir + "/ipv6-eth0"));
}

TEST_F(Router6AttrTest, JsonShowsTheRemoteAddressOverTheLocalOne) {
  Router6Attr both("6in4", "eth0", "2001:db8::/48", "203.0.113.5", "198.51.100.1",
                   "2001:db8::2/64", false);
  Json::Value j = both.ToJson();
  EXPECT_EQ("198.51.100.1", j["config"]["remote_addr_v4"].asString());
  EXPECT_EQ("eth0", j["config"]["wan"].asString());
  EXPECT_EQ("2001:db8::/48", j["config"]["prefix"].asString());
  EXPECT_EQ("2001:db8::2/64", j["config"]["local_addr_v6"].asString());
  EXPECT_FALSE(j["config"].isMember("local_addr_v4"));
  EXPECT_EQ("6in4", j["type"].asString());
  EXPECT_TRUE(j["is_default_gateway"].isBool());

  Router6Attr localOnly("6in4", "eth0", "", "203.0.113.5", "", "", true);
  j = localOnly.ToJson();
  EXPECT_EQ("203.0.113.5", j["config"]["remote_addr_v4"].asString());
  EXPECT_FALSE(j["config"].isMember("prefix"));
  EXPECT_TRUE(j["is_default_gateway"].asBool());

  Router6Attr off;
  j = off.ToJson();
  EXPECT_FALSE(j.isMember("config"));
  EXPECT_EQ("off", j["type"].asString());
  EXPECT_FALSE(j["is_default_gateway"].asBool());
}

TEST_F(Router6AttrTest, EqualityIgnoresLans) {
  Router6Attr a("eth0", true), b("eth0", true);
  a.AddLan("2001:db8::", "lbr0");
  EXPECT_TRUE(a == b);
  b.is_default_gateway = false;
  EXPECT_FALSE(a == b);
}

TEST_F(Router6AttrTest, LanListIgnoresEmptyArgumentsAndRemovesTheFirstExactPair) {
  Router6Attr a("eth0", true);
  a.AddLan("", "lbr0");
  a.AddLan("2001:db8::", "");
  EXPECT_TRUE(a.lans.empty());
  a.AddLan("2001:db8::", "lbr0");
  a.AddLan("2001:db8::", "lbr1");
  a.AddLan("2001:db8::", "lbr0");
  a.RemoveLan("2001:db8::", "lbr0");
  ASSERT_EQ(2u, a.lans.size());
  EXPECT_EQ("lbr1", a.lans[0].second);
  EXPECT_EQ("lbr0", a.lans[1].second);
  a.RemoveLan("2001:db8::", "");
  EXPECT_EQ(2u, a.lans.size());
}

TEST_F(Router6AttrTest, PppoeWithoutAnInterfaceConvertsToEmpty) {
  vorntest::SyslogCapture log;
  // No VORNPPPoeIntfGet action installed: there is no PPPoE interface.
  EXPECT_EQ("", Router6Attr::ConvertInterface("pppoe"));
  EXPECT_TRUE(log.HasOnce(LOG_INFO, vorntest::LogLine("ipv6router/router6_attr.cpp",
                                                      "Failed to get PPPoE interface")))
      << log.Dump();
  EXPECT_EQ("eth0", Router6Attr::ConvertInterface("eth0"));
  vorntest::Run({"/bin/mkdir", "-p", "/usr/vorn/libexec/platform"});
  ASSERT_TRUE(vorntest::WriteFile("/usr/vorn/libexec/platform/VORNPPPoeIntfGet",
                                  "#!/bin/sh\necho ppp0\n", 0755));
  EXPECT_EQ("ppp0", Router6Attr::ConvertInterface("pppoe"));
  Router6Attr attr("pppoe", false);
  EXPECT_EQ("/etc/sysconfig/networking/ipv6-ppp0", attr.GetConfigName());
  unlink("/usr/vorn/libexec/platform/VORNPPPoeIntfGet");
}

}  // namespace
