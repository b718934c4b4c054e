// The module life cycle: states 1, 2 and 3, the failing steps and the base operations.
#include "vornwireless/network/base_module.h"

#include <gtest/gtest.h>

#include "fake_modules.h"
#include "support/syslog_capture.h"

namespace mod = vornnetwork::network::module;
using vorntest::CallLog;
using vorntest::Fakes;
using vorntest::FakeModule;
using vorntest::LogLine;
using vorntest::SyslogCapture;

namespace {

const char kFile[] = "network/base_module.cpp";

// Only the pure operations: shows what the base versions do.
class PlainModule : public mod::BaseModule {
 public:
  PlainModule() : BaseModule(mod::MODULE_DEVICELIST) {}
  int InitialModule() override { return 0; }
  int TerminateModule() override { return 0; }
  int StartModule() override { return 0; }
};

class BaseModuleTest : public ::testing::Test {
 protected:
  void SetUp() override {
    vorntest::ClearManager();
    vorntest::ResetFakes();
  }
  void TearDown() override { vorntest::ClearManager(); }
};

}  // namespace

TEST_F(BaseModuleTest, BaseOperations) {
  PlainModule module;
  EXPECT_EQ(module.GetState(), 1);
  EXPECT_EQ(module.GetType(), mod::MODULE_DEVICELIST);
  EXPECT_EQ(module.ToStr(), "module:4");
  EXPECT_EQ(module.HookEvents(), 0);
  Json::Value request("x"), response(5);
  EXPECT_EQ(module.ProcessRequest(request, response), 0);
  EXPECT_EQ(response, Json::Value(5));
}

TEST_F(BaseModuleTest, IsValidModuleIsOneToFive) {
  for (int t = -2; t <= 8; ++t) EXPECT_EQ(mod::BaseModule::IsValidModule(t), t >= 1 && t <= 5) << t;
  EXPECT_FALSE(mod::BaseModule::IsValidModule(static_cast<int>(0x80000001u)));
}

TEST_F(BaseModuleTest, LifeCycle) {
  FakeModule module(mod::MODULE_ROUTE);
  EXPECT_EQ(module.Initialize(), 0);
  EXPECT_EQ(module.GetState(), 2);
  EXPECT_EQ(module.Initialize(), 0);  // already initialised: nothing runs again
  EXPECT_EQ(Fakes()[3].inits, 1);
  EXPECT_EQ(module.Start(), 0);
  EXPECT_EQ(module.GetState(), 3);
  SyslogCapture log;
  EXPECT_EQ(module.Start(), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Module [3] is not initialized"))) << log.Dump();
  EXPECT_EQ(Fakes()[3].starts, 1);
  EXPECT_EQ(module.Terminate(), 0);
  EXPECT_EQ(module.GetState(), 1);
}

TEST_F(BaseModuleTest, InitializeInStateThreeRunsTheStepsAgain) {
  FakeModule module(mod::MODULE_ROUTE);
  ASSERT_EQ(module.Initialize(), 0);
  ASSERT_EQ(module.Start(), 0);
  EXPECT_EQ(module.Initialize(), 0);
  EXPECT_EQ(Fakes()[3].inits, 2);
  EXPECT_EQ(module.GetState(), 2);
}

TEST_F(BaseModuleTest, FailedHookTerminatesAndReturnsItsValue) {
  Fakes()[3].hookResult = 4;
  FakeModule module(mod::MODULE_ROUTE);
  SyslogCapture log;
  EXPECT_EQ(module.Initialize(), 4);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to hook event of module [3]")))
      << log.Dump();
  EXPECT_EQ(Fakes()[3].inits, 0);
  EXPECT_EQ(Fakes()[3].terminates, 1);
  EXPECT_EQ(module.GetState(), 1);
}

TEST_F(BaseModuleTest, FailedInitTerminatesAndReturnsItsValue) {
  Fakes()[3].initResult = -7;
  FakeModule module(mod::MODULE_ROUTE);
  SyslogCapture log;
  EXPECT_EQ(module.Initialize(), -7);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to init module [3]"))) << log.Dump();
  EXPECT_EQ(CallLog(), (std::vector<std::string>{"create:3", "init:3", "terminate:3"}));
  EXPECT_EQ(module.GetState(), 1);
}

TEST_F(BaseModuleTest, FailedStartKeepsStateTwoAndReturnsItsValue) {
  Fakes()[3].startResult = 6;
  FakeModule module(mod::MODULE_ROUTE);
  ASSERT_EQ(module.Initialize(), 0);
  SyslogCapture log;
  EXPECT_EQ(module.Start(), 6);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to start module [3]"))) << log.Dump();
  EXPECT_EQ(module.GetState(), 2);
}

TEST_F(BaseModuleTest, FailedTerminateKeepsTheState) {
  FakeModule module(mod::MODULE_ROUTE);
  ASSERT_EQ(module.Initialize(), 0);
  ASSERT_EQ(module.Start(), 0);
  Fakes()[3].terminateResult = -1;
  SyslogCapture log;
  EXPECT_EQ(module.Terminate(), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to terminate module [3]"))) << log.Dump();
  EXPECT_EQ(module.GetState(), 3);
}

TEST_F(BaseModuleTest, LockForwardsToTheMutex) {
  FakeModule module(mod::MODULE_ROUTE);
  EXPECT_TRUE(module.Lock());
  EXPECT_FALSE(module.Trylock());
  EXPECT_TRUE(module.Unlock());
  EXPECT_TRUE(module.Trylock());
  EXPECT_TRUE(module.Unlock());
}
