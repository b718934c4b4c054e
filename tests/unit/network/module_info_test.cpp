// The daemon's module table: five rows in creation order, the sample module disabled, and the
// modules this build does not carry reported as not created.
#include <gtest/gtest.h>

#include "support/syslog_capture.h"
#include "vornwireless/network/module_manager.h"
#include "vornwireless/network/test_module/test_module.h"

namespace mod = vornnetwork::network::module;
using mod::ModuleManager;
using vorntest::LogLine;
using vorntest::SyslogCapture;

TEST(ModuleInfo, FiveRowsInCreationOrderWithTheSampleDisabled) {
  ASSERT_EQ(ModuleManager::module_info_count, 5u);
  const int types[] = {1, 5, 2, 3, 4};
  for (std::size_t i = 0; i < 5; ++i) {
    EXPECT_EQ(ModuleManager::module_info[i].type, types[i]) << i;
    EXPECT_EQ(ModuleManager::module_info[i].enabled, i != 0) << i;
    EXPECT_NE(ModuleManager::module_info[i].create, nullptr) << i;
  }
  EXPECT_EQ(ModuleManager::module_info[0].create, &mod::TestModule::Create);
}

TEST(ModuleInfo, DaemonInitializeCreatesNoSampleAndRequestsToAbsentModulesFail) {
  ModuleManager& manager = ModuleManager::GetInstance();
  SyslogCapture log;
  // No module of this build is available: each is reported, none exists, the walk goes on.
  EXPECT_FALSE(manager.Initialize());
  for (int t : {5, 2, 3, 4}) {
    std::string n = std::to_string(t);
    EXPECT_TRUE(log.HasOnce(LOG_INFO, LogLine("network/module_info.cpp",
                                              "The network module [" + n +
                                                  "] is not available in this build")))
        << log.Dump();
    EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("network/module_manager.cpp",
                                             "Failed to create module [" + n + "]")))
        << log.Dump();
    EXPECT_FALSE(manager.IsModuleExist(static_cast<mod::MODULE_TYPE>(t)));
  }
  EXPECT_TRUE(log.Matching("Test Module").empty()) << log.Dump();
  EXPECT_EQ(manager.GetModule(mod::MODULE_TEST), nullptr);
  EXPECT_TRUE(manager.Start());

  Json::Value request(Json::objectValue), response;
  for (int t : {1, 3}) {
    log.Clear();
    EXPECT_EQ(manager.ProcessRequest(static_cast<mod::MODULE_TYPE>(t), request, response), -1);
    EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("network/module_manager.cpp",
                                             "Failed to find module [" + std::to_string(t) + "]")))
        << log.Dump();
  }
  EXPECT_TRUE(response.isNull());
}
