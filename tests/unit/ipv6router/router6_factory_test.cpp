// The factory: requests and records to router objects, with the error codes of each refusal.
#include "vornwireless/ipv6router/router6_factory.h"

#include <gtest/gtest.h>

#include <memory>

#include "ipv6router_test_support.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "vornwireless/ipv6router/6in4.h"
#include "vornwireless/ipv6router/dhcp_pd.h"

namespace {

using vorn::network::ipv6::router::DHCPPD;
using vorn::network::ipv6::router::Router6Attr;
using vorn::network::ipv6::router::Router6Base;
using vorn::network::ipv6::router::Router6Factory;
using vorn::network::ipv6::router::Tunnel6in4;

const char kPublic[] = "203.0.113.5";

Json::Value Parse(const std::string& text) {
  Json::Value v;
  Json::Reader().parse(text, v);
  return v;
}

class Router6FactoryTest : public testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    ipv6routertest::CleanDirs();
    vorntest::Ip({"addr", "del", std::string(kPublic) + "/24", "dev", "eth0"});
    vorntest::IpOk({"link", "set", "eth0", "up"});
  }
  void AddPublic() { vorntest::IpOk({"addr", "add", std::string(kPublic) + "/24", "dev", "eth0"}); }
};

TEST_F(Router6FactoryTest, OffByEveryRouteGivesNullWithErrorZero) {
  Router6Factory byType;
  EXPECT_EQ(nullptr, byType.newRouterV6Instance("off", Parse("{\"wan\": \"eth0\"}")));
  EXPECT_EQ(0, byType.GetError());

  Router6Attr("off", "eth0", "", "", "", "", false).SaveConfig();
  Router6Factory byRecord;
  EXPECT_EQ(nullptr, byRecord.newRouterV6Instance(Parse("{\"wan\": \"eth0\"}")));
  EXPECT_EQ(0, byRecord.GetError());

  Router6Factory byAddress;
  EXPECT_EQ(nullptr, byAddress.newRouterV6Instance(std::string("eth0"), std::string(kPublic)));
  EXPECT_EQ(0, byAddress.GetError());

  // No record at all: nothing to build, and still no error.
  ipv6routertest::CleanDirs();
  Router6Factory noRecord;
  vorntest::SyslogCapture log;
  EXPECT_EQ(nullptr, noRecord.newRouterV6Instance(Parse("{\"wan\": \"eth0\"}")));
  EXPECT_EQ(0, noRecord.GetError());
  EXPECT_TRUE(log.HasOnce(LOG_INFO, vorntest::LogLine("ipv6router/router6_factory.cpp",
                                                      "No existing ipv6 router config")))
      << log.Dump();
}

TEST_F(Router6FactoryTest, SixToFourOnAWanWithOnlyPrivateAddressesGivesError3) {
  // eth0 carries 10.200.1.2/24 from the sandbox, a private address.
  vorntest::SyslogCapture log;
  Router6Factory factory;
  EXPECT_EQ(nullptr, factory.newRouterV6Instance("6to4", Parse("{\"wan\": \"eth0\"}")));
  EXPECT_EQ(3, factory.GetError());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, vorntest::LogLine("ipv6router/router6_factory.cpp",
                                                     "Unable to retrieve public IPv4 on eth0")))
      << log.Dump();
}

TEST_F(Router6FactoryTest, SixToFourDerivesAddressPrefixAndRelayFromThePublicAddress) {
  AddPublic();
  Router6Factory factory;
  std::unique_ptr<Router6Base> router(
      factory.newRouterV6Instance("6to4", Parse("{\"wan\": \"eth0\", \"prefix\": \"x\"}")));
  ASSERT_NE(nullptr, router);
  EXPECT_NE(nullptr, dynamic_cast<Tunnel6in4*>(router.get()));
  Router6Attr const& a = router->GetAttr();
  EXPECT_EQ("6to4", a.type);
  EXPECT_EQ(kPublic, a.local_addr_v4);
  EXPECT_EQ("2002:cb00:7105::1/16", a.local_addr_v6);
  EXPECT_EQ("2002:cb00:7105::/48", a.prefix);
  EXPECT_EQ("192.88.99.1", a.remote_addr_v4);
  EXPECT_FALSE(a.is_default_gateway);
  EXPECT_EQ("1\n", vorntest::ReadFile("/proc/sys/net/ipv6/conf/all/forwarding"));
}

TEST_F(Router6FactoryTest, SixInFourNeedsItsMembersInOrder) {
  AddPublic();
  vorntest::SyslogCapture log;
  Router6Factory factory;
  EXPECT_EQ(nullptr, factory.newRouterV6Instance(
                         "6in4", Parse("{\"wan\": \"eth0\", \"remote_addr_v4\": \"1.2.3.4\"}")));
  EXPECT_EQ(2, factory.GetError());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, vorntest::LogLine("ipv6router/router6_factory.cpp",
                                                     "Missing field: prefix")))
      << log.Dump();

  Router6Factory wrongType;
  EXPECT_EQ(nullptr, wrongType.newRouterV6Instance("6in4", Parse("{\"wan\": [\"eth0\"]}")));
  EXPECT_EQ(2, wrongType.GetError());
  Router6Factory textFlag;
  EXPECT_EQ(nullptr, textFlag.newRouterV6Instance(
                         "native", Parse("{\"wan\": \"eth0\", \"is_default_gateway\": \"yes\"}")));
  EXPECT_EQ(2, textFlag.GetError());
  Router6Factory numberFlag;
  std::unique_ptr<Router6Base> numbered(numberFlag.newRouterV6Instance(
      "native", Parse("{\"wan\": \"eth0\", \"is_default_gateway\": 1}")));
  ASSERT_NE(nullptr, numbered);
  EXPECT_TRUE(numbered->GetAttr().is_default_gateway);

  Router6Factory ok;
  std::unique_ptr<Router6Base> router(ok.newRouterV6Instance(
      "6in4", Parse("{\"wan\": \"eth0\", \"prefix\": \"2001:db8:100::/48\", \"remote_addr_v4\": "
                    "\"198.51.100.1\", \"local_addr_v6\": \"2001:db8:ffff::2/64\", "
                    "\"is_default_gateway\": true}")));
  ASSERT_NE(nullptr, router);
  EXPECT_EQ(Router6Attr("6in4", "eth0", "2001:db8:100::/48", kPublic, "198.51.100.1",
                        "2001:db8:ffff::2/64", true),
            router->GetAttr());
  EXPECT_EQ(0, ok.GetError());
}

TEST_F(Router6FactoryTest, SixInFourWithABadRemoteAddressFailsValidation) {
  AddPublic();
  vorntest::SyslogCapture log;
  Router6Factory factory;
  EXPECT_EQ(nullptr, factory.newRouterV6Instance(
                         "6in4", Parse("{\"wan\": \"eth0\", \"prefix\": \"::/129\", "
                                       "\"remote_addr_v4\": \"not-an-ip\", "
                                       "\"local_addr_v6\": \"2001:db8::2/64\"}")));
  EXPECT_EQ(2, factory.GetError());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, vorntest::LogLine("ipv6router/6in4.cpp",
                                                     "Invalid remote v4 address (not-an-ip)")))
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR,
                          vorntest::LogLine("ipv6router/router6_factory.cpp",
                                            "Failed to validate attr, possiblely wrong "
                                            "parameters?")))
      << log.Dump();
}

TEST_F(Router6FactoryTest, UnknownTypeGivesError2) {
  vorntest::SyslogCapture log;
  Router6Factory factory;
  EXPECT_EQ(nullptr, factory.newRouterV6Instance("6rd", Parse("{\"wan\": \"eth0\"}")));
  EXPECT_EQ(2, factory.GetError());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, vorntest::LogLine("ipv6router/router6_factory.cpp",
                                                     "Bad type: 6rd")))
      << log.Dump();

  // An unknown type in a record.
  ASSERT_TRUE(vorntest::WriteFile(ipv6routertest::kRecordDir + "/ipv6-eth0",
                                  "[conf]\n\ttype=teredo\n\twan=eth0\n[addr]\n[lan]\n"));
  Router6Factory fromRecord;
  EXPECT_EQ(nullptr, fromRecord.newRouterV6Instance(Parse("{\"wan\": \"eth0\"}")));
  EXPECT_EQ(2, fromRecord.GetError());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, vorntest::LogLine("ipv6router/router6_factory.cpp",
                                                     "Bad type: teredo, should not reach here")))
      << log.Dump();
}

TEST_F(Router6FactoryTest, RecordRequestNeedsAWan) {
  Router6Factory factory;
  EXPECT_EQ(nullptr, factory.newRouterV6Instance(Parse("{\"prefix\": \"x\"}")));
  EXPECT_EQ(2, factory.GetError());
  Router6Factory notObject;
  EXPECT_EQ(nullptr, notObject.newRouterV6Instance(Parse("[1, 2]")));
  EXPECT_EQ(2, notObject.GetError());
}

TEST_F(Router6FactoryTest, NativeRouterOnAWanThatIsDownFailsValidationWithError2) {
  vorntest::IpOk({"link", "set", "eth0", "down"});
  vorntest::SyslogCapture log;
  Router6Factory factory;
  EXPECT_EQ(nullptr, factory.newRouterV6Instance("native", Parse("{\"wan\": \"eth0\"}")));
  EXPECT_EQ(2, factory.GetError());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, vorntest::LogLine("ipv6router/dhcp_pd.cpp",
                                                     "wan interface eth0 is down")))
      << log.Dump();
  vorntest::IpOk({"link", "set", "eth0", "up"});
  Router6Factory up;
  std::unique_ptr<Router6Base> router(
      up.newRouterV6Instance("native", Parse("{\"wan\": \"eth0\", \"is_default_gateway\": true}")));
  ASSERT_NE(nullptr, router);
  EXPECT_NE(nullptr, dynamic_cast<DHCPPD*>(router.get()));
  EXPECT_EQ(Router6Attr("eth0", true), router->GetAttr());
}

TEST_F(Router6FactoryTest, ChangedWanAddressRegeneratesTheSixToFourRecord) {
  Router6Attr("6to4", "eth0", "2002:cb00:7105::/48", kPublic, "192.88.99.1",
              "2002:cb00:7105::1/16", false)
      .SaveConfig();
  Router6Factory factory;
  std::unique_ptr<Router6Base> router(
      factory.newRouterV6Instance(std::string("eth0"), std::string("198.51.100.7")));
  ASSERT_NE(nullptr, router);
  EXPECT_EQ("198.51.100.7", router->GetAttr().local_addr_v4);
  EXPECT_EQ("2002:c633:6407::1/16", router->GetAttr().local_addr_v6);
  EXPECT_EQ("2002:c633:6407::/48", router->GetAttr().prefix);

  // A 6in4 record only takes the new local address. (The record says is_default_gateway=no;
  // the key's presence reads as true while no gateway database answers.)
  Router6Attr("6in4", "eth0", "2001:db8::/48", kPublic, "198.51.100.1", "2001:db8::2/64", false)
      .SaveConfig();
  Router6Factory six;
  router.reset(six.newRouterV6Instance(std::string("eth0"), std::string("198.51.100.7")));
  ASSERT_NE(nullptr, router);
  EXPECT_EQ(Router6Attr("6in4", "eth0", "2001:db8::/48", "198.51.100.7", "198.51.100.1",
                        "2001:db8::2/64", true),
            router->GetAttr());

  // A native record keeps its addresses.
  Router6Attr("eth0", true).SaveConfig();
  Router6Factory native;
  router.reset(native.newRouterV6Instance(std::string("eth0"), std::string("198.51.100.7")));
  ASSERT_NE(nullptr, router);
  EXPECT_EQ("", router->GetAttr().local_addr_v4);

  ipv6routertest::CleanDirs();
  vorntest::SyslogCapture log;
  Router6Factory none;
  EXPECT_EQ(nullptr, none.newRouterV6Instance(std::string("eth0"), std::string("1.2.3.4")));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, vorntest::LogLine("ipv6router/router6_factory.cpp",
                                                     "No IPv6 router config for eth0 available")))
      << log.Dump();
}

}  // namespace
