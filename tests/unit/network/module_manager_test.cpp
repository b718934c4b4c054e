// The module manager over test tables of recording modules: creation, initialisation and start
// order, failures that do not stop the others, requests, removal, hooks and event delivery.
#include "vornwireless/network/module_manager.h"

#include <gtest/gtest.h>

#include "fake_modules.h"
#include "support/syslog_capture.h"
#include "vornwireless/network/event/hello_event.h"
#include "vornwireless/network/test_module/test_module.h"

namespace mod = vornnetwork::network::module;
namespace ev = vornnetwork::network::event;
using mod::ModuleManager;
using vorntest::CallLog;
using vorntest::CreateFake;
using vorntest::EventLog;
using vorntest::Fakes;
using vorntest::LogLine;
using vorntest::SyslogCapture;

namespace {

const char kFile[] = "network/module_manager.cpp";
const char kBase[] = "network/base_module.cpp";

// The daemon's row order with recording modules.
const ModuleManager::MODULE_INFO kTable[] = {
    {mod::MODULE_TEST, false, mod::TestModule::Create},
    {mod::MODULE_NETLINK, true, CreateFake<mod::MODULE_NETLINK>},
    {mod::MODULE_IPV6, true, CreateFake<mod::MODULE_IPV6>},
    {mod::MODULE_ROUTE, true, CreateFake<mod::MODULE_ROUTE>},
    {mod::MODULE_DEVICELIST, true, CreateFake<mod::MODULE_DEVICELIST>},
};
const std::size_t kTableCount = sizeof(kTable) / sizeof(kTable[0]);

class ModuleManagerTest : public ::testing::Test {
 protected:
  void SetUp() override {
    vorntest::ClearManager();
    vorntest::ResetFakes();
  }
  void TearDown() override { vorntest::ClearManager(); }
  ModuleManager& manager = ModuleManager::GetInstance();
};

// A module whose handler overrides the one named in the hook.
class OverridingModule : public vorntest::FakeModule {
 public:
  OverridingModule() : FakeModule(mod::MODULE_ROUTE) {}
  int OnEvent(ev::BaseEvent const* /*event*/) override {
    ++overrides;
    return 0;
  }
  static int overrides;
};
int OverridingModule::overrides = 0;

}  // namespace

TEST_F(ModuleManagerTest, GetInstanceIsOneObject) {
  EXPECT_EQ(&ModuleManager::GetInstance(), &ModuleManager::GetInstance());
}

TEST_F(ModuleManagerTest, CreatesInTableOrderInitialisesAndStartsInTypeOrder) {
  ASSERT_TRUE(manager.Initialize(kTable, kTableCount));
  ASSERT_TRUE(manager.Start());
  std::vector<std::string> expected = {"create:5", "create:2", "create:3", "create:4",
                                       "init:2",   "init:3",   "init:4",   "init:5",
                                       "start:2",  "start:3",  "start:4",  "start:5"};
  EXPECT_EQ(CallLog(), expected);
  for (int t = 2; t <= 5; ++t) {
    ASSERT_NE(manager.GetModule(static_cast<mod::MODULE_TYPE>(t)), nullptr);
    EXPECT_EQ(manager.GetModule(static_cast<mod::MODULE_TYPE>(t))->GetState(), 3);
  }
}

TEST_F(ModuleManagerTest, DisabledRowHasNoObjectAndRequestsFindNoModule) {
  SyslogCapture log;
  ASSERT_TRUE(manager.Initialize(kTable, kTableCount));
  EXPECT_EQ(manager.GetModule(mod::MODULE_TEST), nullptr);
  EXPECT_FALSE(manager.IsModuleExist(mod::MODULE_TEST));
  EXPECT_TRUE(log.Matching("Constructor of Test Module").empty()) << log.Dump();
  Json::Value request(Json::objectValue), response;
  request["cmd"] = "hello";
  EXPECT_EQ(manager.ProcessRequest(mod::MODULE_TEST, request, response), -1);
  EXPECT_TRUE(response.isNull());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to find module [1]"))) << log.Dump();
}

TEST_F(ModuleManagerTest, AddModuleOfDisabledRowDoesNothing) {
  EXPECT_TRUE(manager.AddModule(kTable[0]));
  EXPECT_FALSE(manager.IsModuleExist(mod::MODULE_TEST));
}

TEST_F(ModuleManagerTest, InitializeTwiceKeepsModulesAndDoesNotInitialiseAgain) {
  ASSERT_TRUE(manager.Initialize(kTable, kTableCount));
  mod::BaseModule* route = manager.GetModule(mod::MODULE_ROUTE);
  SyslogCapture log;
  EXPECT_TRUE(manager.Initialize(kTable, kTableCount));
  EXPECT_EQ(manager.GetModule(mod::MODULE_ROUTE), route);
  for (int t = 2; t <= 5; ++t) {
    EXPECT_EQ(Fakes()[t].created, 1) << t;
    EXPECT_EQ(Fakes()[t].inits, 1) << t;
    EXPECT_TRUE(log.HasOnce(LOG_INFO, LogLine(kFile, "The network module [" + std::to_string(t) +
                                                         "] has been created.")))
        << log.Dump();
  }
}

TEST_F(ModuleManagerTest, StartOfModuleWhoseInitializeFailedIsRefusedOthersStart) {
  Fakes()[mod::MODULE_ROUTE].initResult = -5;
  SyslogCapture log;
  EXPECT_FALSE(manager.Initialize(kTable, kTableCount));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kBase, "Failed to init module [3]"))) << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to init module [3]"))) << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to initial modules"))) << log.Dump();
  // The failed module was terminated and stays listed in state 1; the others went on.
  ASSERT_NE(manager.GetModule(mod::MODULE_ROUTE), nullptr);
  EXPECT_EQ(manager.GetModule(mod::MODULE_ROUTE)->GetState(), 1);
  EXPECT_EQ(Fakes()[mod::MODULE_ROUTE].terminates, 1);
  EXPECT_EQ(Fakes()[mod::MODULE_DEVICELIST].inits, 1);
  EXPECT_EQ(Fakes()[mod::MODULE_NETLINK].inits, 1);

  log.Clear();
  EXPECT_FALSE(manager.Start());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kBase, "Module [3] is not initialized"))) << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to start module [3]"))) << log.Dump();
  EXPECT_EQ(Fakes()[mod::MODULE_ROUTE].starts, 0);
  for (int t : {2, 4, 5}) {
    EXPECT_EQ(Fakes()[t].starts, 1) << t;
    EXPECT_EQ(manager.GetModule(static_cast<mod::MODULE_TYPE>(t))->GetState(), 3);
  }
  // A request still reaches the module that failed.
  Json::Value response;
  EXPECT_EQ(manager.ProcessRequest(mod::MODULE_ROUTE, Json::Value("x"), response), 0);
  EXPECT_EQ(Fakes()[mod::MODULE_ROUTE].requests, 1);
}

TEST_F(ModuleManagerTest, FailedStartIsCountedOthersStart) {
  Fakes()[mod::MODULE_IPV6].startResult = 9;
  ASSERT_TRUE(manager.Initialize(kTable, kTableCount));
  SyslogCapture log;
  EXPECT_FALSE(manager.Start());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kBase, "Failed to start module [2]"))) << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to start module [2]"))) << log.Dump();
  EXPECT_EQ(manager.GetModule(mod::MODULE_IPV6)->GetState(), 2);
  EXPECT_EQ(manager.GetModule(mod::MODULE_NETLINK)->GetState(), 3);
  // A started module cannot be started again.
  EXPECT_EQ(manager.GetModule(mod::MODULE_NETLINK)->Start(), -1);
}

TEST_F(ModuleManagerTest, FactoryGivingNullIsCountedTheWalkGoesOn) {
  const ModuleManager::MODULE_INFO table[] = {
      {mod::MODULE_NETLINK, true, CreateFake<mod::MODULE_NETLINK>},
      {mod::MODULE_IPV6, true, [] { return static_cast<mod::BaseModule*>(nullptr); }},
      {mod::MODULE_ROUTE, true, CreateFake<mod::MODULE_ROUTE>},
  };
  SyslogCapture log;
  EXPECT_FALSE(manager.Initialize(table, 3));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to create module [2]"))) << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to initial module [2]"))) << log.Dump();
  EXPECT_FALSE(manager.IsModuleExist(mod::MODULE_IPV6));
  EXPECT_EQ(manager.GetModule(mod::MODULE_ROUTE)->GetState(), 2);
  EXPECT_EQ(manager.GetModule(mod::MODULE_NETLINK)->GetState(), 2);
}

TEST_F(ModuleManagerTest, ProcessRequestGivesTheModulesResultUnchanged) {
  ASSERT_TRUE(manager.Initialize(kTable, kTableCount));
  Json::Value request(Json::objectValue), response;
  request["a"] = 1;
  SyslogCapture log;
  EXPECT_EQ(manager.ProcessRequest(mod::MODULE_DEVICELIST, request, response), 0);
  EXPECT_EQ(response["echo"], request);
  EXPECT_EQ(response["module"].asInt(), 4);
  EXPECT_TRUE(log.Matching("Failed").empty()) << log.Dump();

  Fakes()[mod::MODULE_DEVICELIST].requestResult = 7;
  EXPECT_EQ(manager.ProcessRequest(mod::MODULE_DEVICELIST, request, response), 7);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to process request from module [4]")))
      << log.Dump();
}

TEST_F(ModuleManagerTest, RemoveModuleTerminatesDeletesAndUnlists) {
  ASSERT_TRUE(manager.Initialize(kTable, kTableCount));
  ASSERT_TRUE(manager.Start());
  EXPECT_FALSE(manager.RemoveModule(mod::MODULE_ROUTE));
  EXPECT_EQ(Fakes()[mod::MODULE_ROUTE].terminates, 1);
  EXPECT_EQ(Fakes()[mod::MODULE_ROUTE].destroyed, 1);
  EXPECT_FALSE(manager.IsModuleExist(mod::MODULE_ROUTE));
  EXPECT_EQ(manager.FindModule(mod::MODULE_ROUTE), manager.FindModule(mod::MODULE_TEST));
  // Not there at all: true.
  EXPECT_TRUE(manager.RemoveModule(mod::MODULE_ROUTE));
  EXPECT_TRUE(manager.RemoveModule(mod::MODULE_TEST));
}

TEST_F(ModuleManagerTest, RemoveModuleDeletesEvenWhenTerminateFails) {
  Fakes()[mod::MODULE_IPV6].terminateResult = -1;
  ASSERT_TRUE(manager.Initialize(kTable, kTableCount));
  SyslogCapture log;
  EXPECT_FALSE(manager.RemoveModule(mod::MODULE_IPV6));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kBase, "Failed to terminate module [2]"))) << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to terminiate module [2]")))
      << log.Dump();
  EXPECT_EQ(Fakes()[mod::MODULE_IPV6].destroyed, 1);
}

TEST_F(ModuleManagerTest, HookingTheSameModuleTwiceFailsAndLeavesOneHandler) {
  auto handler = static_cast<mod::EVENT_HANDLER>(&vorntest::FakeModule::OnEvent);
  EXPECT_EQ(manager.HookEvent(ev::EVENT_HELLO, mod::MODULE_ROUTE, handler), 0);
  SyslogCapture log;
  EXPECT_EQ(manager.HookEvent(ev::EVENT_HELLO, mod::MODULE_ROUTE, handler), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("network/event/event_table.cpp",
                                           "The module [3] has been registered.")))
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile,
                                           "Failed to register event [1] by module [3] with "
                                           "ret=[-1]")))
      << log.Dump();
  EXPECT_EQ(manager.GetEventTable().ListHandlers(ev::EVENT_HELLO).size(), 1u);
}

TEST_F(ModuleManagerTest, HookingTwiceThroughTheModuleLogsInTheModuleToo) {
  ASSERT_TRUE(manager.Initialize(kTable, kTableCount));
  mod::BaseModule* route = manager.GetModule(mod::MODULE_ROUTE);
  auto handler = static_cast<mod::EVENT_HANDLER>(&vorntest::FakeModule::OnEvent);
  EXPECT_EQ(route->HookEvent(ev::EVENT_HELLO, handler), 0);
  SyslogCapture log;
  EXPECT_EQ(route->HookEvent(ev::EVENT_HELLO, handler), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kBase, "Failed to hook event [1] of module [3]")))
      << log.Dump();
  EXPECT_EQ(manager.GetEventTable().ListHandlers(ev::EVENT_HELLO).size(), 1u);
  EXPECT_EQ(route->UnHookEvent(ev::EVENT_HELLO), 0);
  EXPECT_FALSE(manager.GetEventTable().IsEventExist(ev::EVENT_HELLO));
}

TEST_F(ModuleManagerTest, UnHookOfModuleThatNeverHookedIsNoFailure) {
  EXPECT_EQ(manager.UnHookEvent(ev::EVENT_HELLO, mod::MODULE_DEVICELIST), 0);
  auto handler = static_cast<mod::EVENT_HANDLER>(&vorntest::FakeModule::OnEvent);
  ASSERT_EQ(manager.HookEvent(ev::EVENT_HELLO, mod::MODULE_ROUTE, handler), 0);
  EXPECT_EQ(manager.UnHookEvent(ev::EVENT_HELLO, mod::MODULE_DEVICELIST), 0);
  EXPECT_EQ(manager.GetEventTable().ListHandlers(ev::EVENT_HELLO).size(), 1u);
}

TEST_F(ModuleManagerTest, NotifyRefusesNullAndInvalidEvents) {
  SyslogCapture log;
  EXPECT_EQ(manager.NotifyEvent(nullptr), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "NULL Event Pointer"))) << log.Dump();
  ev::HelloEvent empty("");
  EXPECT_EQ(manager.NotifyEvent(&empty), -1);
  EXPECT_EQ(log.Matching("network/module_manager.cpp:\\d+ Invalid event \\[event:\\[1\\]/ msg:\\[\\]").size(), 1u)
      << log.Dump();
}

TEST_F(ModuleManagerTest, NotifyCallsHandlersInRegistrationOrderAndCountsFailures) {
  for (int t : {2, 3, 4, 5}) Fakes()[t].hookHello = true;
  Fakes()[mod::MODULE_ROUTE].eventResult = -3;
  Fakes()[mod::MODULE_NETLINK].eventResult = 2;
  ASSERT_TRUE(manager.Initialize(kTable, kTableCount));
  EXPECT_EQ(manager.GetEventTable().ToStr(), "event[1]/ modules[2, 3, 4, 5, ]");
  ev::HelloEvent hello("hi");
  SyslogCapture log;
  EXPECT_EQ(manager.NotifyEvent(&hello), 2);
  EXPECT_EQ(EventLog(), (std::vector<int>{2, 3, 4, 5}));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile,
                                           "Failed to handler event [1] by module [3] and ret=[-3]")))
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile,
                                           "Failed to handler event [1] by module [5] and ret=[2]")))
      << log.Dump();
}

TEST_F(ModuleManagerTest, HandlersOfARemovedModuleStayAndAreReported) {
  for (int t : {2, 3}) Fakes()[t].hookHello = true;
  ASSERT_TRUE(manager.Initialize(kTable, kTableCount));
  EXPECT_FALSE(manager.RemoveModule(mod::MODULE_IPV6));
  ev::HelloEvent hello("hi");
  SyslogCapture log;
  EXPECT_EQ(manager.NotifyEvent(&hello), 1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "NULL pointer for module [2]"))) << log.Dump();
  EXPECT_EQ(EventLog(), (std::vector<int>{3}));
}

TEST_F(ModuleManagerTest, VirtualHandlerIsHonoured) {
  const ModuleManager::MODULE_INFO table[] = {
      {mod::MODULE_ROUTE, true, [] { return static_cast<mod::BaseModule*>(new OverridingModule); }},
  };
  Fakes()[mod::MODULE_ROUTE].hookHello = true;
  OverridingModule::overrides = 0;
  ASSERT_TRUE(manager.Initialize(table, 1));
  ev::HelloEvent hello("hi");
  EXPECT_EQ(manager.NotifyEvent(&hello), 0);
  EXPECT_EQ(OverridingModule::overrides, 1);
  EXPECT_TRUE(EventLog().empty());
}

TEST_F(ModuleManagerTest, DumpLogsEachModule) {
  ASSERT_TRUE(manager.Initialize(kTable, kTableCount));
  SyslogCapture log;
  manager.Dump();
  for (int t = 2; t <= 5; ++t) {
    EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "module: [module:" + std::to_string(t) + "]")))
        << log.Dump();
  }
}
