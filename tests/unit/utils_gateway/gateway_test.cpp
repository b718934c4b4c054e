// Gateway on a veth with a peer at 10.200.1.1: the kernel's route read back with /sbin/ip, the
// configured value in its key file, and the system log events the changes write.
#include "vornwireless/utils/gateway.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "fixtures/fake_journal.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "vornplatform/gateway.h"

using vorntest::LogLine;
using vornwireless::utils::Gateway;
using vornwireless::utils::IPAddress;

namespace {

const char kLogAction[] = "/usr/vorn/libexec/platform/VORNLogSet1";

vorntest::RunResult Ip(std::vector<std::string> args) {
  args.insert(args.begin(), "/sbin/ip");
  return vorntest::Run(args);
}

std::string DefaultRoutes() { return Ip({"-4", "route", "show", "default"}).out; }

std::vector<std::vector<std::string>> LogEvents() {
  std::vector<std::vector<std::string>> events;
  for (auto& call : vorntest::FakeCallsTo(kLogAction)) events.push_back(call.argv);
  return events;
}

std::vector<std::string> Event(const char* id, const std::string& a, const std::string& b) {
  return {"2", "1", id, a, b, "", ""};
}

class GatewayTest : public ::testing::Test {
 protected:
  void SetUp() override {
    while (Ip({"-4", "route", "del", "default"}).status == 0) {
    }
    vorntest::Run({"/bin/rm", "-rf", VORN_GATEWAY_DELETED_FILE, VORN_GATEWAY_CONF_FILE});
    ASSERT_TRUE(vorntest::InstallFake(kLogAction));
    vorntest::ClearFakeJournal();
  }
  void SetConfig(const char* gateway) { ASSERT_EQ(VORNNetDefaultGatewaySetConf(gateway), 0); }
};

}  // namespace

TEST_F(GatewayTest, GetAndGetConfig) {
  Gateway gw;
  IPAddress current("1.2.3.4"), config("1.2.3.4");
  EXPECT_EQ(gw.Get(current), 0);
  EXPECT_TRUE(current.IsEmpty());
  EXPECT_EQ(gw.GetConfig(config), 0);
  EXPECT_TRUE(config.IsEmpty());
  ASSERT_EQ(Ip({"route", "add", "default", "via", "10.200.1.1"}).status, 0);
  SetConfig("10.200.1.9");
  EXPECT_EQ(gw.Get(current), 0);
  EXPECT_EQ(current.ToString(), "10.200.1.1");
  EXPECT_EQ(gw.GetConfig(config), 0);
  EXPECT_EQ(config.ToString(), "10.200.1.9");
}

TEST_F(GatewayTest, SetANewGatewayWithoutConfigReportsAChange) {
  Gateway gw;
  ASSERT_EQ(gw.Set(IPAddress("10.200.1.1")), 0);
  EXPECT_EQ(DefaultRoutes(), "default via 10.200.1.1 dev eth0 \n");
  EXPECT_EQ(vorntest::ReadFile(VORN_GATEWAY_CONF_FILE), "default_gateway=10.200.1.1\n");
  EXPECT_EQ(LogEvents(),
            std::vector<std::vector<std::string>>{Event("0x11801311", "", "10.200.1.1")});
}

TEST_F(GatewayTest, SetAnotherGateway) {
  ASSERT_EQ(Ip({"route", "add", "default", "via", "10.200.1.1"}).status, 0);
  SetConfig("10.200.1.1");
  Gateway gw;
  ASSERT_EQ(gw.Set(IPAddress("10.200.1.7")), 0);
  EXPECT_EQ(DefaultRoutes(), "default via 10.200.1.7 dev eth0 \n");
  EXPECT_EQ(vorntest::ReadFile(VORN_GATEWAY_CONF_FILE), "default_gateway=10.200.1.7\n");
  EXPECT_EQ(LogEvents(),
            std::vector<std::vector<std::string>>{Event("0x11801311", "10.200.1.1", "10.200.1.7")});
}

TEST_F(GatewayTest, SetEmptyRemovesTheConfiguredGateway) {
  ASSERT_EQ(Ip({"route", "add", "default", "via", "10.200.1.1"}).status, 0);
  SetConfig("10.200.1.1");
  Gateway gw;
  ASSERT_EQ(gw.Set(IPAddress()), 0);
  EXPECT_EQ(DefaultRoutes(), "");
  EXPECT_EQ(vorntest::ReadFile(VORN_GATEWAY_CONF_FILE), "default_gateway=\n");
  EXPECT_EQ(LogEvents(),
            std::vector<std::vector<std::string>>{Event("0x11801310", "10.200.1.1", "")});
}

TEST_F(GatewayTest, SetEmptyWithoutConfigRemovesTheLiveRoute) {
  ASSERT_EQ(Ip({"route", "add", "default", "via", "10.200.1.1"}).status, 0);
  Gateway gw;
  ASSERT_EQ(gw.Set(IPAddress("")), 0);
  EXPECT_EQ(DefaultRoutes(), "");
  EXPECT_EQ(LogEvents(), std::vector<std::vector<std::string>>{Event("0x1180130f", "", "")});
}

TEST_F(GatewayTest, SetTheSameGatewayChangesNothing) {
  ASSERT_EQ(Ip({"route", "add", "default", "via", "10.200.1.1", "metric", "7"}).status, 0);
  SetConfig("10.200.1.1");
  vorntest::SyslogCapture log;
  Gateway gw;
  EXPECT_EQ(gw.Set(IPAddress("10.200.1.1")), 0);
  EXPECT_EQ(DefaultRoutes(), "default via 10.200.1.1 dev eth0 metric 7 \n");
  EXPECT_TRUE(LogEvents().empty());
  EXPECT_TRUE(log.Lines().empty()) << log.Dump();
  // Nothing at all, and nothing configured: the same.
  ASSERT_EQ(Ip({"route", "del", "default"}).status, 0);
  SetConfig("");
  EXPECT_EQ(gw.Set(IPAddress()), 0);
  EXPECT_TRUE(LogEvents().empty());
}

TEST_F(GatewayTest, SameLiveGatewayButOtherConfigIsAChange) {
  ASSERT_EQ(Ip({"route", "add", "default", "via", "10.200.1.1"}).status, 0);
  SetConfig("10.200.1.9");
  Gateway gw;
  EXPECT_EQ(gw.Set(IPAddress("10.200.1.1")), 0);
  EXPECT_EQ(vorntest::ReadFile(VORN_GATEWAY_CONF_FILE), "default_gateway=10.200.1.1\n");
  EXPECT_EQ(LogEvents(),
            std::vector<std::vector<std::string>>{Event("0x11801311", "10.200.1.9", "10.200.1.1")});
}

TEST_F(GatewayTest, UnreachableGatewayFailsAfterTheConfig) {
  ASSERT_EQ(Ip({"route", "add", "default", "via", "10.200.1.1"}).status, 0);
  vorntest::SyslogCapture log;
  Gateway gw;
  EXPECT_EQ(gw.Set(IPAddress("192.0.2.1")), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/gateway.cpp", "set gateway failed")))
      << log.Dump();
  // No rollback: the configuration step stays done, the route stays as it was.
  EXPECT_EQ(vorntest::ReadFile(VORN_GATEWAY_CONF_FILE), "default_gateway=192.0.2.1\n");
  EXPECT_EQ(DefaultRoutes(), "default via 10.200.1.1 dev eth0 \n");
  EXPECT_TRUE(LogEvents().empty());
}

TEST_F(GatewayTest, ConfigThatCannotBeWritten) {
  ASSERT_EQ(vorntest::Run({"/bin/mkdir", "-p", "/usr/vorn/etc"}).status, 0);
  vorntest::ReadOnlyMount ro("/usr/vorn/etc");
  ASSERT_TRUE(ro.ok());
  vorntest::SyslogCapture log;
  Gateway gw;
  EXPECT_EQ(gw.Set(IPAddress("10.200.1.1")), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/gateway.cpp", "set gateway conf failed")))
      << log.Dump();
  EXPECT_EQ(DefaultRoutes(), "");
  EXPECT_TRUE(LogEvents().empty());
}

TEST_F(GatewayTest, ConfigThatCannotBeReadLogsThePlatformError) {
  ASSERT_EQ(vorntest::Run({"/bin/mkdir", "-p", VORN_GATEWAY_CONF_FILE}).status, 0);
  vorntest::SyslogCapture log;
  Gateway gw;
  IPAddress config;
  EXPECT_EQ(gw.GetConfig(config), -1);
  auto lines = log.Matching("get gateway config failed");
  ASSERT_EQ(lines.size(), 1u) << log.Dump();
  EXPECT_EQ(lines[0].level, LOG_ERR);
  EXPECT_TRUE(log.HasOnce(LOG_ERR,
                          "^utils/gateway\\.cpp:\\d+ get gateway config failed "
                          "\\[0x0[0-9A-F]00 [a-z_/]+\\.cpp:\\d+\\]$"))
      << log.Dump();
  log.Clear();
  EXPECT_EQ(gw.Set(IPAddress("10.200.1.1")), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/gateway.cpp", "Failed to get gateway conf")))
      << log.Dump();
  EXPECT_EQ(DefaultRoutes(), "");
}

TEST_F(GatewayTest, BackupTheLiveGatewayAndRestoreIt) {
  ASSERT_EQ(Ip({"route", "add", "default", "via", "10.200.1.1"}).status, 0);
  SetConfig("10.200.1.9");
  Gateway gw;
  ASSERT_EQ(gw.Backup(), 0);
  ASSERT_EQ(gw.Set(IPAddress()), 0);
  EXPECT_EQ(DefaultRoutes(), "");
  vorntest::ClearFakeJournal();
  gw.Restore();
  EXPECT_EQ(DefaultRoutes(), "default via 10.200.1.1 dev eth0 \n");
  EXPECT_EQ(vorntest::ReadFile(VORN_GATEWAY_CONF_FILE), "default_gateway=10.200.1.1\n");
  EXPECT_EQ(LogEvents(),
            std::vector<std::vector<std::string>>{Event("0x11801311", "", "10.200.1.1")});
}

TEST_F(GatewayTest, BackupFallsBackToTheConfiguredGateway) {
  SetConfig("10.200.1.9");
  Gateway gw;
  ASSERT_EQ(gw.Backup(), 0);
  gw.Restore();
  EXPECT_EQ(DefaultRoutes(), "default via 10.200.1.9 dev eth0 \n");
}

TEST_F(GatewayTest, BackupWithoutAnyGatewayFails) {
  vorntest::SyslogCapture log;
  Gateway gw;
  EXPECT_EQ(gw.Backup(), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/gateway.cpp", "Failed to backup gateway")))
      << log.Dump();
  // Nothing saved: nothing restored.
  ASSERT_EQ(Ip({"route", "add", "default", "via", "10.200.1.1"}).status, 0);
  gw.Restore();
  EXPECT_EQ(DefaultRoutes(), "default via 10.200.1.1 dev eth0 \n");
  EXPECT_TRUE(LogEvents().empty());
}

TEST_F(GatewayTest, RestoreWithoutBackupDoesNothing) {
  ASSERT_EQ(Ip({"route", "add", "default", "via", "10.200.1.1", "metric", "3"}).status, 0);
  SetConfig("10.200.1.9");
  vorntest::SyslogCapture log;
  Gateway gw;
  gw.Restore();
  EXPECT_EQ(DefaultRoutes(), "default via 10.200.1.1 dev eth0 metric 3 \n");
  EXPECT_EQ(vorntest::ReadFile(VORN_GATEWAY_CONF_FILE), "default_gateway=10.200.1.9\n");
  EXPECT_TRUE(LogEvents().empty());
  EXPECT_TRUE(log.Lines().empty()) << log.Dump();
}
