// The policy tables are not managed in this build: both calls log and succeed.
#include "vornwireless/network/route/policy_route.h"

#include <gtest/gtest.h>

#include "support/syslog_capture.h"
#include "support/test_util.h"

using vornnetwork::network::IPTYPE_V4;
using vornnetwork::network::IPTYPE_V6;
using vornnetwork::network::PolicyRoute;
using vorntest::LogLine;
using vorntest::SyslogCapture;

TEST(PolicyRoute, EnableAndDisableAreLoggedNoOps) {
  SyslogCapture log;
  PolicyRoute route;
  EXPECT_EQ(route.DisableTable(IPTYPE_V4, "static"), 0);
  EXPECT_EQ(route.EnableTable(IPTYPE_V6, "static", "all"), 0);
  EXPECT_TRUE(log.HasOnce(LOG_INFO, LogLine("network/route/policy_route.cpp",
                                            "Policy route tables are not managed in this build, "
                                            "DisableTable [static] type [0] skipped")))
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_INFO, LogLine("network/route/policy_route.cpp",
                                            "Policy route tables are not managed in this build, "
                                            "EnableTable [static] type [1] source [all] skipped")))
      << log.Dump();
  // The rules of the kernel are not touched.
  auto rules = vorntest::Run({"/sbin/ip", "rule", "show"});
  EXPECT_EQ(rules.out.find("static-table"), std::string::npos);
}
