// The default gateway over rtnetlink, read back with the real /sbin/ip, and the configured one.
#include "vornplatform/gateway.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "support/test_util.h"
#include "vornplatform/err.h"

namespace {

vorntest::RunResult Ip(std::vector<std::string> args) {
  args.insert(args.begin(), "/sbin/ip");
  return vorntest::Run(args);
}

std::string DefaultRoutes() { return Ip({"-4", "route", "show", "default"}).out; }

std::string Get() {
  char buf[20] = "junk";
  EXPECT_EQ(VORNNetDefaultGatewayGet(buf, sizeof buf), 0);
  return buf;
}

std::string GetConf() {
  char buf[20] = "junk";
  EXPECT_EQ(VORNNetDefaultGatewayGetConf(buf, sizeof buf), 0);
  return buf;
}

class GatewayTest : public ::testing::Test {
 protected:
  void SetUp() override {
    while (Ip({"-4", "route", "del", "default"}).status == 0) {
    }
    vorntest::Run({"/bin/rm", "-f", VORN_GATEWAY_DELETED_FILE, VORN_GATEWAY_CONF_FILE});
    VLIBCErrClear();
  }
};

}  // namespace

TEST_F(GatewayTest, NoDefaultRouteGivesEmptyText) {
  EXPECT_EQ(Get(), "");
  EXPECT_EQ(DefaultRoutes(), "");
}

TEST_F(GatewayTest, SetAddsTheRouteTheKernelShows) {
  ASSERT_EQ(VORNNetDefaultGatewaySet("10.200.1.1"), 0);
  EXPECT_EQ(DefaultRoutes(), "default via 10.200.1.1 dev eth0 \n");
  EXPECT_EQ(Get(), "10.200.1.1");
  // Setting another one replaces it.
  ASSERT_EQ(VORNNetDefaultGatewaySet("10.200.1.7"), 0);
  EXPECT_EQ(DefaultRoutes(), "default via 10.200.1.7 dev eth0 \n");
  EXPECT_EQ(Get(), "10.200.1.7");
}

TEST_F(GatewayTest, GetTakesTheLowestMetric) {
  ASSERT_EQ(Ip({"route", "add", "default", "via", "10.200.1.1", "metric", "100"}).status, 0);
  ASSERT_EQ(Ip({"route", "add", "default", "via", "10.200.1.9", "metric", "5"}).status, 0);
  EXPECT_EQ(Get(), "10.200.1.9");
  // Another table's default route is not the system's gateway.
  ASSERT_EQ(Ip({"route", "add", "default", "via", "10.200.1.3", "table", "100"}).status, 0);
  EXPECT_EQ(Get(), "10.200.1.9");
  Ip({"route", "flush", "table", "100"});
}

TEST_F(GatewayTest, DeleteRemembersAndRestores) {
  ASSERT_EQ(Ip({"route", "add", "default", "via", "10.200.1.1", "metric", "100"}).status, 0);
  ASSERT_EQ(Ip({"route", "add", "default", "via", "10.200.1.9", "metric", "200"}).status, 0);
  ASSERT_EQ(VORNNetDefaultGatewaySet(nullptr), 0);
  EXPECT_EQ(DefaultRoutes(), "");
  EXPECT_EQ(vorntest::ReadFile(VORN_GATEWAY_DELETED_FILE), "10.200.1.1\n");
  // The kernel has none now: the deleted one is the system's gateway.
  EXPECT_EQ(Get(), "10.200.1.1");
  // Deleting again with nothing there keeps it.
  ASSERT_EQ(VORNNetDefaultGatewaySet(nullptr), 0);
  EXPECT_EQ(Get(), "10.200.1.1");

  // A live route comes first.
  ASSERT_EQ(Ip({"route", "add", "default", "via", "10.200.1.5"}).status, 0);
  EXPECT_EQ(Get(), "10.200.1.5");
  ASSERT_EQ(Ip({"route", "del", "default"}).status, 0);

  // Restoring it puts the route back and forgets it.
  char saved[20];
  ASSERT_EQ(VORNNetDefaultGatewayGet(saved, sizeof saved), 0);
  ASSERT_EQ(VORNNetDefaultGatewaySet(saved), 0);
  EXPECT_EQ(DefaultRoutes(), "default via 10.200.1.1 dev eth0 \n");
  EXPECT_FALSE(vorntest::Exists(VORN_GATEWAY_DELETED_FILE));
}

TEST_F(GatewayTest, EmptyTextDeletesAndForgets) {
  ASSERT_EQ(Ip({"route", "add", "default", "via", "10.200.1.1"}).status, 0);
  ASSERT_EQ(VORNNetDefaultGatewaySet(nullptr), 0);
  ASSERT_EQ(Ip({"route", "add", "default", "via", "10.200.1.1"}).status, 0);
  ASSERT_EQ(VORNNetDefaultGatewaySet(""), 0);
  EXPECT_EQ(DefaultRoutes(), "");
  EXPECT_EQ(Get(), "");
  EXPECT_FALSE(vorntest::Exists(VORN_GATEWAY_DELETED_FILE));
}

TEST_F(GatewayTest, RouteOverADeviceAloneIsDeletedButHasNoGateway) {
  ASSERT_EQ(Ip({"route", "add", "default", "dev", "eth0"}).status, 0);
  EXPECT_EQ(Get(), "");
  ASSERT_EQ(VORNNetDefaultGatewaySet(nullptr), 0);
  EXPECT_EQ(DefaultRoutes(), "");
  EXPECT_FALSE(vorntest::Exists(VORN_GATEWAY_DELETED_FILE));
}

TEST_F(GatewayTest, BadGatewaysLeaveTheRouteAsItWas) {
  ASSERT_EQ(Ip({"route", "add", "default", "via", "10.200.1.1"}).status, 0);
  const std::string before = DefaultRoutes();
  for (const char* bad :
       {"not-an-address", "fe80::1", "10.200.1.1; reboot", "10.200.1.256", "10.200.1.1 "}) {
    VLIBCErrClear();
    EXPECT_EQ(VORNNetDefaultGatewaySet(bad), -1) << bad;
    EXPECT_EQ(VLIBCErrGet(), 0xd00) << bad;
  }
  // Not reachable from any interface: the kernel refuses it.
  EXPECT_EQ(VORNNetDefaultGatewaySet("192.0.2.1"), -1);
  EXPECT_NE(VLIBCErrGet(), 0);
  EXPECT_EQ(DefaultRoutes(), before);
}

TEST_F(GatewayTest, BuffersAreChecked) {
  ASSERT_EQ(Ip({"route", "add", "default", "via", "10.200.1.1"}).status, 0);
  char small[8] = "junk";
  EXPECT_EQ(VORNNetDefaultGatewayGet(small, sizeof small), -1);
  EXPECT_EQ(VLIBCErrGet(), 0x700);
  EXPECT_STREQ(small, "");
  EXPECT_EQ(VORNNetDefaultGatewayGet(nullptr, 20), -1);
  EXPECT_EQ(VLIBCErrGet(), 0xd00);
  char buf[20];
  EXPECT_EQ(VORNNetDefaultGatewayGet(buf, 0), -1);
  EXPECT_EQ(VORNNetDefaultGatewayGetConf(nullptr, 20), -1);
}

TEST_F(GatewayTest, ConfiguredGatewayLivesInItsKeyFile) {
  EXPECT_EQ(GetConf(), "");  // no file yet
  ASSERT_EQ(VORNNetDefaultGatewaySetConf("10.200.1.1"), 0);
  EXPECT_EQ(vorntest::ReadFile(VORN_GATEWAY_CONF_FILE), "default_gateway=10.200.1.1\n");
  EXPECT_EQ(GetConf(), "10.200.1.1");
  // Other lines of the file stay.
  ASSERT_TRUE(vorntest::WriteFile(VORN_GATEWAY_CONF_FILE,
                                  "# gateway\nother=1\ndefault_gateway=10.200.1.1\n"));
  ASSERT_EQ(VORNNetDefaultGatewaySetConf("10.200.1.9"), 0);
  EXPECT_EQ(vorntest::ReadFile(VORN_GATEWAY_CONF_FILE),
            "# gateway\nother=1\ndefault_gateway=10.200.1.9\n");
  ASSERT_EQ(VORNNetDefaultGatewaySetConf(""), 0);
  EXPECT_EQ(GetConf(), "");
  ASSERT_EQ(VORNNetDefaultGatewaySetConf(nullptr), 0);
  EXPECT_EQ(GetConf(), "");
  // The live route is not touched by the configuration.
  EXPECT_EQ(DefaultRoutes(), "");
}

TEST_F(GatewayTest, BadConfiguredGatewayLeavesTheFile) {
  ASSERT_EQ(VORNNetDefaultGatewaySetConf("10.200.1.1"), 0);
  EXPECT_EQ(VORNNetDefaultGatewaySetConf("10.200.1.1\nother=2"), -1);
  EXPECT_EQ(VLIBCErrGet(), 0xd00);
  EXPECT_EQ(VORNNetDefaultGatewaySetConf("gateway"), -1);
  EXPECT_EQ(vorntest::ReadFile(VORN_GATEWAY_CONF_FILE), "default_gateway=10.200.1.1\n");
}

TEST_F(GatewayTest, UnreadableConfigIsAnError) {
  ASSERT_EQ(vorntest::Run({"/bin/mkdir", "-p", VORN_GATEWAY_CONF_FILE}).status, 0);
  char buf[20];
  EXPECT_EQ(VORNNetDefaultGatewayGetConf(buf, sizeof buf), -1);
  EXPECT_NE(VLIBCErrGet(), 0);
  vorntest::Run({"/bin/rmdir", VORN_GATEWAY_CONF_FILE});
}
