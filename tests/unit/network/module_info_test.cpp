// The daemon's module table: five rows in creation order, the sample module disabled, the netlink
// and route modules carried, and the modules this build does not carry reported as not created.
#include <gtest/gtest.h>

#include "support/syslog_capture.h"
#include "vornwireless/network/module_manager.h"
#include "vornwireless/network/netlink/netlink_module.h"
#include "vornwireless/network/route/route_module.h"
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

TEST(ModuleInfo, TheNetlinkAndRouteModulesAreCarriedTheOthersReportedAbsent) {
  EXPECT_EQ(ModuleManager::module_info[1].create, &mod::NetlinkModule::Create);
  EXPECT_EQ(ModuleManager::module_info[3].create, &mod::RouteModule::Create);

  ModuleManager& manager = ModuleManager::GetInstance();
  SyslogCapture log;
  // The modules this build does not carry are reported and missing; the walk goes on, so the
  // ones it carries are created, initialised and started.
  EXPECT_FALSE(manager.Initialize());
  for (int t : {2, 4}) {
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
  EXPECT_TRUE(log.Matching("module \\[[35]\\]").empty()) << log.Dump();
  EXPECT_TRUE(manager.IsModuleExist(mod::MODULE_NETLINK));
  EXPECT_TRUE(manager.IsModuleExist(mod::MODULE_ROUTE));
  EXPECT_TRUE(log.Matching("Test Module").empty()) << log.Dump();
  EXPECT_EQ(manager.GetModule(mod::MODULE_TEST), nullptr);
  EXPECT_TRUE(manager.Start());
  EXPECT_EQ(mod::MODULE_STATE_STARTED, manager.GetModule(mod::MODULE_NETLINK)->GetState());
  EXPECT_EQ(mod::MODULE_STATE_STARTED, manager.GetModule(mod::MODULE_ROUTE)->GetState());

  Json::Value request(Json::objectValue), response;
  for (int t : {1, 2, 4}) {
    log.Clear();
    EXPECT_EQ(manager.ProcessRequest(static_cast<mod::MODULE_TYPE>(t), request, response), -1);
    EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("network/module_manager.cpp",
                                             "Failed to find module [" + std::to_string(t) + "]")))
        << log.Dump();
  }
  EXPECT_TRUE(response.isNull());
  // The route module answers its queries.
  request["method"] = "GET_GATEWAY_DATA_BY_INTERFACE";
  request["type"] = "GTYPE_V4";
  request["ifname"] = "eth0";
  EXPECT_EQ(0, manager.ProcessRequest(mod::MODULE_ROUTE, request, response));
  EXPECT_EQ(-1, response["priority"].asInt());
  EXPECT_FALSE(response["exist"].asBool());
  // Removal answers whether the module still exists.
  for (int t : {5, 3}) {
    EXPECT_FALSE(manager.RemoveModule(static_cast<mod::MODULE_TYPE>(t))) << t;
    EXPECT_FALSE(manager.IsModuleExist(static_cast<mod::MODULE_TYPE>(t))) << t;
  }
}
