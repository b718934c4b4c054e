// The platform functions of the route module: SIOCGIFADDR on a real veth, and the platform
// actions (argv, stdout, missing and failing actions) through the recording fake.
#include "vornplatform/route_actions.h"

#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

#include "fixtures/fake_journal.h"
#include "support/test_util.h"
#include "vornplatform/err.h"

namespace {

const char kDir[] = "/usr/vorn/libexec/platform/";

std::string Action(char const* name) { return std::string(kDir) + name; }

void Remove(char const* name) { vorntest::Run({"/bin/rm", "-f", Action(name)}); }

void Reply(char const* name, std::string const& out, int exitCode) {
  ASSERT_TRUE(vorntest::InstallFake(Action(name)));
  Json::Value entry;
  entry["stdout"] = out;
  entry["exit"] = exitCode;
  ASSERT_TRUE(vorntest::AddFakeReply(Action(name), entry));
}

class RouteActions : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    vorntest::WriteFakeReplies(Json::Value(Json::objectValue));
    vorntest::ClearFakeJournal();
  }
};

}  // namespace

TEST_F(RouteActions, GetIPGivesTheIpv4AddressOfTheInterface) {
  char buf[1024] = "x";
  EXPECT_EQ(VORNILnxGetIP("eth0", buf, sizeof buf), 0);
  EXPECT_STREQ(buf, "10.200.1.2");
  EXPECT_EQ(VORNILnxGetIP("lo", buf, sizeof buf), 0);
  EXPECT_STREQ(buf, "127.0.0.1");
}

TEST_F(RouteActions, GetIPFailuresLeaveEmptyText) {
  char buf[1024] = "x";
  VLIBCErrClear();
  EXPECT_EQ(VORNILnxGetIP("nosuch0", buf, sizeof buf), -1);
  EXPECT_STREQ(buf, "");
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_NOT_FOUND);
  std::strcpy(buf, "x");
  EXPECT_EQ(VORNILnxGetIP("", buf, sizeof buf), -1);
  EXPECT_STREQ(buf, "");
  EXPECT_EQ(VORNILnxGetIP(nullptr, buf, sizeof buf), -1);
  EXPECT_EQ(VORNILnxGetIP(std::string(100000, 'e').c_str(), buf, sizeof buf), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_BAD_PARAMETER);
  char small[8] = "x";
  EXPECT_EQ(VORNILnxGetIP("eth0", small, sizeof small), -1);
  EXPECT_STREQ(small, "");
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_TOO_LONG);
  EXPECT_EQ(VORNILnxGetIP("eth0", nullptr, 16), -1);
  // An interface without an IPv4 address.
  ASSERT_EQ(vorntest::Run({"/sbin/ip", "addr", "flush", "dev", "eth0"}).status, 0);
  std::strcpy(buf, "x");
  EXPECT_EQ(VORNILnxGetIP("eth0", buf, sizeof buf), -1);
  EXPECT_STREQ(buf, "");
  ASSERT_EQ(vorntest::Run({"/sbin/ip", "addr", "add", "10.200.1.2/24", "dev", "eth0"}).status, 0);
}

TEST_F(RouteActions, HaIsRunningReadsTheFirstLine) {
  Remove("VORNHAIsRunning");
  EXPECT_EQ(VORNHAIsRunning(), 0);
  Reply("VORNHAIsRunning", "1\n", 0);
  EXPECT_NE(VORNHAIsRunning(), 0);
  vorntest::WriteFakeReplies(Json::Value(Json::objectValue));
  Reply("VORNHAIsRunning", "0\n", 0);
  EXPECT_EQ(VORNHAIsRunning(), 0);
  vorntest::WriteFakeReplies(Json::Value(Json::objectValue));
  Reply("VORNHAIsRunning", "1\n", 3);
  EXPECT_EQ(VORNHAIsRunning(), 0);
  ASSERT_EQ(vorntest::FakeCallsTo(Action("VORNHAIsRunning")).size(), 3u);
  EXPECT_TRUE(vorntest::FakeCallsTo(Action("VORNHAIsRunning"))[0].argv.empty());
  Remove("VORNHAIsRunning");
}

TEST_F(RouteActions, HeartbeatInterfaceIsTheFirstLine) {
  char buf[16] = "x";
  Remove("VORNHAGetHeartbeatIF");
  EXPECT_EQ(VORNHAGetHeartbeatIF(buf, sizeof buf), 0);
  EXPECT_STREQ(buf, "");
  Reply("VORNHAGetHeartbeatIF", "mon.hb0\nrest\n", 0);
  EXPECT_EQ(VORNHAGetHeartbeatIF(buf, sizeof buf), 0);
  EXPECT_STREQ(buf, "mon.hb0");
  vorntest::WriteFakeReplies(Json::Value(Json::objectValue));
  Reply("VORNHAGetHeartbeatIF", "mon.hb0\n", 1);
  EXPECT_EQ(VORNHAGetHeartbeatIF(buf, sizeof buf), -1);
  EXPECT_STREQ(buf, "");
  vorntest::WriteFakeReplies(Json::Value(Json::objectValue));
  Reply("VORNHAGetHeartbeatIF", "a-name-that-is-too-long\n", 0);
  VLIBCErrClear();
  EXPECT_EQ(VORNHAGetHeartbeatIF(buf, sizeof buf), -1);
  EXPECT_STREQ(buf, "");
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_TOO_LONG);
  EXPECT_EQ(VORNHAGetHeartbeatIF(nullptr, 16), -1);
  Remove("VORNHAGetHeartbeatIF");
}

TEST_F(RouteActions, GatewayHookPassesItsArgumentsAsArgv) {
  Remove("VORNNetGatewayConfigChangeHook");
  EXPECT_EQ(VORNNetGatewayConfigChangeHook(4, "ipv4", "eth0", "", "10.0.0.1"), 0);
  ASSERT_TRUE(vorntest::InstallFake(Action("VORNNetGatewayConfigChangeHook")));
  EXPECT_EQ(VORNNetGatewayConfigChangeHook(4, "ipv4", "eth0", "", "10.0.0.1"), 0);
  EXPECT_EQ(VORNNetGatewayConfigChangeHook(5, "ipv6", "x; y", nullptr, "::"), 0);
  auto calls = vorntest::FakeCallsTo(Action("VORNNetGatewayConfigChangeHook"));
  ASSERT_EQ(calls.size(), 2u);
  EXPECT_EQ(calls[0].argv, (std::vector<std::string>{"4", "ipv4", "eth0", "", "10.0.0.1"}));
  EXPECT_EQ(calls[1].argv, (std::vector<std::string>{"5", "ipv6", "x; y", "", "::"}));
  Json::Value fail;
  fail["exit"] = 2;
  ASSERT_TRUE(vorntest::AddFakeReply(Action("VORNNetGatewayConfigChangeHook"), fail));
  VLIBCErrClear();
  EXPECT_EQ(VORNNetGatewayConfigChangeHook(4, "ipv4", "eth0", "a", "b"), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_EXEC);
  Remove("VORNNetGatewayConfigChangeHook");
}

TEST_F(RouteActions, DnsHookPassesTheListAfterStageAndInterface) {
  ASSERT_TRUE(vorntest::InstallFake(Action("VORNNetDnsConfigChangeHook")));
  PVLIBSZLIST list = VLIBCSzListAlloc(2);
  ASSERT_NE(list, nullptr);
  EXPECT_EQ(VORNNetDnsConfigChangeHook(4, "eth0", list), 0);
  VLIBCSzListPush(&list, "8.8.8.8");
  VLIBCSzListPush(&list, "2001:db8::53");
  EXPECT_EQ(VORNNetDnsConfigChangeHook(5, "eth0", list), 0);
  EXPECT_EQ(VORNNetDnsConfigChangeHook(4, "eth1", nullptr), 0);
  VLIBCSzListFree(list);
  auto calls = vorntest::FakeCallsTo(Action("VORNNetDnsConfigChangeHook"));
  ASSERT_EQ(calls.size(), 3u);
  EXPECT_EQ(calls[0].argv, (std::vector<std::string>{"4", "eth0"}));
  EXPECT_EQ(calls[1].argv, (std::vector<std::string>{"5", "eth0", "8.8.8.8", "2001:db8::53"}));
  EXPECT_EQ(calls[2].argv, (std::vector<std::string>{"4", "eth1"}));
  Remove("VORNNetDnsConfigChangeHook");
  EXPECT_EQ(VORNNetDnsConfigChangeHook(4, "eth0", nullptr), 0);
}

TEST_F(RouteActions, DnsUpdateRunsItsActionWithoutArguments) {
  Remove("VORNNetDNSUpdate");
  EXPECT_EQ(vornnetsdk::sdk_s::VORNNetDNSUpdate_S(), 0);
  ASSERT_TRUE(vorntest::InstallFake(Action("VORNNetDNSUpdate")));
  EXPECT_EQ(vornnetsdk::sdk_s::VORNNetDNSUpdate_S(), 0);
  auto calls = vorntest::FakeCallsTo(Action("VORNNetDNSUpdate"));
  ASSERT_EQ(calls.size(), 1u);
  EXPECT_TRUE(calls[0].argv.empty());
  Json::Value fail;
  fail["exit"] = 1;
  ASSERT_TRUE(vorntest::AddFakeReply(Action("VORNNetDNSUpdate"), fail));
  EXPECT_EQ(vornnetsdk::sdk_s::VORNNetDNSUpdate_S(), -1);
  Remove("VORNNetDNSUpdate");
}
