// The sample module enabled in a test table: its life cycle, its request and the hook, notify,
// process and unhook paths of the hello event.
#include "vornwireless/network/test_module/test_module.h"

#include <gtest/gtest.h>

#include <regex>

#include "support/syslog_capture.h"
#include "vornwireless/network/event/hello_event.h"
#include "vornwireless/network/module_manager.h"

namespace mod = vornnetwork::network::module;
namespace ev = vornnetwork::network::event;
using mod::ModuleManager;
using vorntest::LogLine;
using vorntest::SyslogCapture;

namespace {

const char kFile[] = "network/test_module/test_module.cpp";

// The daemon's table with the sample module switched on.
const ModuleManager::MODULE_INFO kTestTable[] = {
    {mod::MODULE_TEST, true, mod::TestModule::Create},
};

class TestModuleTest : public ::testing::Test {
 protected:
  void TearDown() override {
    manager.RemoveModule(mod::MODULE_TEST);
    manager.UnHookEvent(ev::EVENT_HELLO, mod::MODULE_TEST);
  }
  ModuleManager& manager = ModuleManager::GetInstance();
};

}  // namespace

TEST_F(TestModuleTest, LifeCycleThroughTheManager) {
  SyslogCapture log;
  ASSERT_TRUE(manager.Initialize(kTestTable, 1));
  ASSERT_TRUE(manager.Start());
  auto lines = log.Matching(kFile);
  ASSERT_EQ(lines.size(), 4u) << log.Dump();
  EXPECT_TRUE(std::regex_search(lines[0].message, std::regex("Constructor of Test Module$")));
  EXPECT_TRUE(std::regex_search(lines[1].message,
                                std::regex("Success to hook hello event by test module$")));
  EXPECT_TRUE(std::regex_search(lines[2].message, std::regex("Initial Test Module$")));
  EXPECT_TRUE(std::regex_search(lines[3].message, std::regex("Start Test Module$")));
  EXPECT_EQ(manager.GetModule(mod::MODULE_TEST)->GetState(), 3);
  EXPECT_EQ(manager.GetModule(mod::MODULE_TEST)->ToStr(), "module:1");

  log.Clear();
  Json::Value response;
  EXPECT_EQ(manager.ProcessRequest(mod::MODULE_TEST, Json::Value("x"), response), 0);
  EXPECT_TRUE(log.HasOnce(LOG_INFO, LogLine(kFile, "ProcessRequest of Test Module"))) << log.Dump();

  log.Clear();
  EXPECT_FALSE(manager.RemoveModule(mod::MODULE_TEST));
  EXPECT_TRUE(log.HasOnce(LOG_INFO, LogLine(kFile, "Terminate Test Module"))) << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_INFO, LogLine(kFile, "Destructor of Test Module"))) << log.Dump();
}

TEST_F(TestModuleTest, HelloEventReachesTheModuleAndUnhookStopsIt) {
  ASSERT_TRUE(manager.Initialize(kTestTable, 1));
  EXPECT_EQ(manager.GetEventTable().ToStr(), "event[1]/ modules[1, ]");
  ev::HelloEvent hello("hi");
  SyslogCapture log;
  EXPECT_EQ(hello.Process(), 0);
  EXPECT_EQ(log.Matching(std::string(kFile) +
                         ":\\d+ TestModule process hello event \\[event:\\[1\\]/ msg:\\[hi\\]")
                .size(),
            1u)
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_INFO, LogLine("network/event/hello_event.cpp",
                                            "process by hello event")))
      << log.Dump();
  EXPECT_TRUE(hello.IsNotified());
  EXPECT_TRUE(hello.IsProcessed());

  // Hooking again through the module fails and keeps one handler.
  log.Clear();
  EXPECT_EQ(manager.GetModule(mod::MODULE_TEST)->HookEvents(), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to hook hello event by test module")))
      << log.Dump();
  EXPECT_EQ(manager.GetEventTable().ListHandlers(ev::EVENT_HELLO).size(), 1u);

  EXPECT_EQ(manager.GetModule(mod::MODULE_TEST)->UnHookEvent(ev::EVENT_HELLO), 0);
  EXPECT_EQ(manager.GetModule(mod::MODULE_TEST)->UnHookEvent(ev::EVENT_HELLO), 0);
  ev::HelloEvent second("again");
  log.Clear();
  EXPECT_EQ(second.Process(), 0);
  EXPECT_TRUE(log.Matching("TestModule process hello event").empty()) << log.Dump();
}

TEST_F(TestModuleTest, EmptyHelloIsRefusedAndReachesNoHandler) {
  ASSERT_TRUE(manager.Initialize(kTestTable, 1));
  ev::HelloEvent empty("");
  SyslogCapture log;
  EXPECT_EQ(empty.Process(), -1);
  EXPECT_TRUE(log.Matching("TestModule process hello event").empty()) << log.Dump();
  EXPECT_TRUE(log.Matching("process by hello event").empty()) << log.Dump();
  EXPECT_FALSE(empty.IsNotified());
  EXPECT_FALSE(empty.IsProcessed());
}

TEST_F(TestModuleTest, SecondSampleCannotHookAndIsTerminated) {
  // A second module of type 1 cannot hook: its Initialize fails at the hook step.
  ASSERT_TRUE(manager.Initialize(kTestTable, 1));
  mod::TestModule other;
  SyslogCapture log;
  EXPECT_EQ(other.Initialize(), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("network/base_module.cpp",
                                           "Failed to hook event of module [1]")))
      << log.Dump();
  EXPECT_EQ(other.GetState(), 1);
}

TEST_F(TestModuleTest, NullEventIsRefused) {
  mod::TestModule module;
  SyslogCapture log;
  EXPECT_EQ(module.OnHelloEvent(nullptr), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Null event pointer"))) << log.Dump();
  ev::HelloEvent hello("direct");
  EXPECT_EQ(module.OnHelloEvent(&hello), 0);
}
