// Prefix allocation over the router records on disk.
#include "vornwireless/ipv6router/router6_prefix.h"

#include <gtest/gtest.h>

#include <boost/lexical_cast.hpp>

#include "ipv6router_test_support.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"

namespace {

using vorn::network::ipv6::router::Router6Attr;
using vorn::network::ipv6::router::Router6Prefix;
using vorn::network::ipv6::router::Router6PrefixAttr;

std::string Show(std::vector<Router6PrefixAttr> const& list) {
  std::string out;
  for (auto const& e : list) out += e.prefix + "|" + e.wan + "|" + e.lan + "\n";
  return out;
}

void Save(std::string const& wan, std::string const& prefix) {
  ASSERT_EQ(0, Router6Attr("6in4", wan, prefix, "203.0.113.5", "198.51.100.1", "2001:db8::2/64",
                           false)
                   .SaveConfig());
}

class Router6PrefixTest : public testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    ipv6routertest::CleanDirs();
  }
};

TEST_F(Router6PrefixTest, A64OffersOnePrefixAndA48Two) {
  Save("eth0", "2001:db8:0:100::/64");
  Save("eth1", "2001:0db8:0200::/48");
  Router6Prefix prefixes;
  EXPECT_EQ(
      "2001:db8:0:100::|eth0|\n"
      "2001:db8:200::|eth1|\n"
      "2001:db8:200:1::|eth1|\n",
      Show(prefixes.List()));
}

TEST_F(Router6PrefixTest, AllocateGivesAFreePrefixOnceAndSavesIt) {
  Save("eth1", "2001:db8:200::/48");
  Router6Prefix prefixes;
  EXPECT_TRUE(prefixes.Allocate("2001:0db8:0200:0001::", "lbr0"));
  EXPECT_EQ("2001:db8:200::|eth1|\n2001:db8:200:1::|eth1|lbr0\n", Show(prefixes.List()));
  EXPECT_NE(std::string::npos,
            ipv6routertest::Record("eth1").find("[lan]\n\t2001:db8:200:1::=lbr0\n"));

  vorntest::SyslogCapture log;
  EXPECT_FALSE(prefixes.Allocate("2001:db8:200:1::", "lbr1"));
  EXPECT_TRUE(log.HasOnce(LOG_WARNING,
                          vorntest::LogLine("ipv6router/router6_prefix.cpp",
                                            "Unable to find matching prefix 2001:db8:200:1:: "
                                            "allocate for lbr1")))
      << log.Dump();

  // A fresh view of the disk sees the allocation too, and a second LAN gets the other half.
  Router6Prefix reloaded;
  EXPECT_FALSE(reloaded.Allocate("2001:db8:200:1::", "lbr1"));
  EXPECT_TRUE(reloaded.Allocate("2001:db8:200::", "lbr1"));
  EXPECT_EQ("2001:db8:200::|eth1|lbr1\n2001:db8:200:1::|eth1|lbr0\n", Show(reloaded.List()));
}

TEST_F(Router6PrefixTest, DeallocateFreesAndAnUnknownPrefixStillSucceeds) {
  Save("eth1", "2001:db8:200::/48");
  Router6Prefix prefixes;
  ASSERT_TRUE(prefixes.Allocate("2001:db8:200::", "lbr0"));
  EXPECT_TRUE(prefixes.Deallocate("2001:db8:200::", "lbr0"));
  EXPECT_EQ("2001:db8:200::|eth1|\n2001:db8:200:1::|eth1|\n", Show(Router6Prefix().List()));

  vorntest::SyslogCapture log;
  EXPECT_TRUE(prefixes.Deallocate("2001:db8:999::", "lbr0"));
  EXPECT_TRUE(prefixes.Deallocate("x/abc", "lbr0"));
  EXPECT_EQ(2u, log.Matching("No matching prefix .* to remove, possibly gone").size())
      << log.Dump();
}

TEST_F(Router6PrefixTest, BadPrefixesOfferNothing) {
  Save("eth0", "::/129");
  Save("eth1", "2001:db8::/200");
  Save("eth2", "2001:db8::");
  Save("eth3", "");
  vorntest::SyslogCapture log;
  Router6Prefix prefixes;
  EXPECT_EQ("", Show(prefixes.List()));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, vorntest::LogLine("ipv6router/router6_prefix.cpp",
                                                     "Error: require larger prefix range for "
                                                     "splitting (cur: 129, max: 63)")))
      << log.Dump();
  EXPECT_EQ(1u, log.Matching("cur: 200, max: 63").size());
  EXPECT_EQ(1u, log.Matching("Unable to tokenize prefix 2001:db8::, skip").size());
  EXPECT_EQ(1u, log.Matching("Empty prefix, skip").size());
  EXPECT_FALSE(prefixes.Allocate("::", "lbr0"));
  EXPECT_FALSE(prefixes.Allocate("x/abc", "lbr0"));
}

TEST_F(Router6PrefixTest, ANonNumericLengthRaisesBadLexicalCast) {
  Save("eth0", "x/abc");
  Router6Prefix prefixes;
  EXPECT_THROW(prefixes.List(), boost::bad_lexical_cast);
}

TEST_F(Router6PrefixTest, LoadSkipsRecordsWithoutAWan) {
  Save("eth0", "2001:db8:0:100::/64");
  ASSERT_TRUE(vorntest::WriteFile(ipv6routertest::kRecordDir + "/ipv6-broken", "[conf]\n"));
  ASSERT_TRUE(vorntest::WriteFile(ipv6routertest::kRecordDir + "/other-eth9", "[conf]\nwan=eth9\n"));
  vorntest::SyslogCapture log;
  Router6Prefix prefixes;
  EXPECT_EQ(1u, prefixes.Records().size());
  EXPECT_TRUE(log.HasOnce(LOG_WARNING,
                          vorntest::LogLine("ipv6router/router6_prefix.cpp",
                                            "Failed to get wan from "
                                            "/etc/sysconfig/networking/ipv6-broken")))
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_WARNING,
                          vorntest::LogLine("ipv6router/router6_prefix.cpp",
                                            "Failed to load (some of) IPv6 router config")))
      << log.Dump();
}

}  // namespace
