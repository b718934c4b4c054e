// The driver switch of a topology change: usb-wifi-util.sh unloads the old topology's driver and
// loads the new one's, and the switch then gives the driver three seconds (run under the time
// seam, so the wait is real to the product and short for the test).
#include <time.h>

#include <gtest/gtest.h>

#include "fixtures/fake_journal.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "vornwireless/wifi/adapter.h"

using namespace vornwireless::wifi;
using vorntest::LogLine;
using vorntest::SyslogCapture;

namespace {

const char kUtil[] = "/lib/udev/script/usb-wifi-util.sh";

double Now() {
  struct timespec ts;
  clock_gettime(CLOCK_MONOTONIC, &ts);
  return ts.tv_sec + ts.tv_nsec / 1e9;
}

class KernelModule : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    ASSERT_TRUE(vorntest::InstallFake(kUtil));
    ASSERT_TRUE(vorntest::WriteFakeReplies(Json::Value(Json::objectValue)));
    ASSERT_TRUE(vorntest::ClearFakeJournal());
  }
};

TEST_F(KernelModule, UnloadsTheOldDriverLoadsTheNewOneAndWaitsThreeSeconds) {
  const double start = Now();
  EXPECT_EQ(0, Adapter::SwitchKernelModule(WIFI_TOPOLOGY_ROUTER, WIFI_TOPOLOGY_BRIDGE));
  const double waited = Now() - start;
  auto calls = vorntest::FakeCallsTo(kUtil);
  ASSERT_EQ(2u, calls.size());
  EXPECT_EQ((std::vector<std::string>{"unload-driver", "router"}), calls[0].argv);
  EXPECT_EQ((std::vector<std::string>{"load-driver", "bridge"}), calls[1].argv);
  EXPECT_GE(waited, 3.0);
}

TEST_F(KernelModule, ClientTopologyNamesAreThoseOfTheTopologyTable) {
  EXPECT_EQ(0, Adapter::SwitchKernelModule(WIFI_TOPOLOGY_CLIENT, WIFI_TOPOLOGY_ROUTER));
  auto calls = vorntest::FakeCallsTo(kUtil);
  ASSERT_EQ(2u, calls.size());
  EXPECT_EQ((std::vector<std::string>{"unload-driver", "client"}), calls[0].argv);
  EXPECT_EQ((std::vector<std::string>{"load-driver", "router"}), calls[1].argv);
}

// Only a script that could not run fails the switch; its own exit status is the script's affair.
TEST_F(KernelModule, AScriptThatExitsNonZeroStillCounts) {
  Json::Value replies;
  replies[kUtil][0]["exit"] = 3;
  ASSERT_TRUE(vorntest::WriteFakeReplies(replies));
  EXPECT_EQ(0, Adapter::SwitchKernelModule(WIFI_TOPOLOGY_ROUTER, WIFI_TOPOLOGY_BRIDGE));
  EXPECT_EQ(2u, vorntest::FakeCallsTo(kUtil).size());
}

TEST_F(KernelModule, AMissingScriptFailsAtTheUnloadAndLoadsNothing) {
  vorntest::Run({"/bin/rm", "-f", kUtil});
  SyslogCapture log;
  EXPECT_EQ(-1, Adapter::SwitchKernelModule(WIFI_TOPOLOGY_ROUTER, WIFI_TOPOLOGY_BRIDGE));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("wifi/adapter.cpp",
                                           "Error on cmd [/lib/udev/script/usb-wifi-util.sh "
                                           "unload-driver router]")))
      << log.Dump();
  EXPECT_TRUE(log.Matching("load-driver bridge").empty()) << log.Dump();
}

}  // namespace
