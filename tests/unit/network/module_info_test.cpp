// The daemon's module table: five rows in creation order, the sample module disabled, every
// other module carried, created, started and removed.
#include <gtest/gtest.h>

#include "support/syslog_capture.h"
#include "vornwireless/network/devicelist/device_list_module.h"
#include "vornwireless/network/ipv6/ipv6_module.h"
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

TEST(ModuleInfo, EveryEnabledModuleIsCarriedCreatedAndStarted) {
  EXPECT_EQ(ModuleManager::module_info[1].create, &mod::NetlinkModule::Create);
  EXPECT_EQ(ModuleManager::module_info[2].create, &mod::IPv6Module::Create);
  EXPECT_EQ(ModuleManager::module_info[3].create, &mod::RouteModule::Create);
  EXPECT_EQ(ModuleManager::module_info[4].create, &mod::DeviceListModule::Create);

  ModuleManager& manager = ModuleManager::GetInstance();
  SyslogCapture log;
  EXPECT_TRUE(manager.Initialize()) << log.Dump();
  EXPECT_TRUE(log.Matching("is not available in this build").empty()) << log.Dump();
  EXPECT_TRUE(log.Matching("Failed to create module").empty()) << log.Dump();
  for (int t : {2, 3, 4, 5}) {
    EXPECT_TRUE(manager.IsModuleExist(static_cast<mod::MODULE_TYPE>(t))) << t;
  }
  EXPECT_TRUE(log.Matching("Test Module").empty()) << log.Dump();
  EXPECT_EQ(manager.GetModule(mod::MODULE_TEST), nullptr);
  EXPECT_TRUE(manager.Start());
  for (int t : {2, 3, 4, 5}) {
    EXPECT_EQ(mod::MODULE_STATE_STARTED,
              manager.GetModule(static_cast<mod::MODULE_TYPE>(t))->GetState())
        << t;
  }

  Json::Value request(Json::objectValue), response;
  log.Clear();
  EXPECT_EQ(manager.ProcessRequest(mod::MODULE_TEST, request, response), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("network/module_manager.cpp",
                                           "Failed to find module [1]")))
      << log.Dump();
  EXPECT_TRUE(response.isNull());
  // The route module answers its queries.
  request["method"] = "GET_GATEWAY_DATA_BY_INTERFACE";
  request["type"] = "GTYPE_V4";
  request["ifname"] = "eth0";
  EXPECT_EQ(0, manager.ProcessRequest(mod::MODULE_ROUTE, request, response));
  EXPECT_EQ(-1, response["priority"].asInt());
  EXPECT_FALSE(response["exist"].asBool());
  // Removal answers whether the module still exists; the IPv6 watch thread is joined on the way.
  for (int t : {5, 2, 3, 4}) {
    EXPECT_FALSE(manager.RemoveModule(static_cast<mod::MODULE_TYPE>(t))) << t;
    EXPECT_FALSE(manager.IsModuleExist(static_cast<mod::MODULE_TYPE>(t))) << t;
  }
}
