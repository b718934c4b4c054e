// A one-port dongle gets its only node back from the dialler at Disconnect: the next status query
// goes to the modem again and reports the SIM as it is. The real vornusbmodemd under the time
// seam, the modem simulator on one node, the real wvdial through its wrapper, gdbus as client.
#include <gtest/gtest.h>
#include <stdlib.h>

#include <algorithm>
#include <string>
#include <vector>

#include "e2e_support.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"

using namespace usbmodem_e2e;

namespace {

std::string Field(const Reply& r, const std::string& key) {
  std::string v;
  ParseJson(r.value, key, &v);
  return v;
}

std::string NetStatus() { return Field(Call("GetUSBModem", {"usbmodem3"}), "net_status"); }

std::size_t SimQueries() {
  const std::vector<std::string> cmds = TranscriptCommands(3);
  return static_cast<std::size_t>(std::count(cmds.begin(), cmds.end(), "AT+CPIN?"));
}

class OnePortDisconnect : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    ASSERT_TRUE(InstallPeers());
    CleanModemState();
  }
  void TearDown() override {
    daemon_.Stop();
    sim_.Stop();
    CleanModemState();
  }
  Child daemon_;
  Child sim_;
};

}  // namespace

TEST_F(OnePortDisconnect, FirstQueryAfterEachDisconnectReachesTheNodeAndReportsReady) {
  // The dialler takes a real second to hang up after SIGTERM, twice the node hand-back pause
  // under the time seam: the node must not be queried while the dialler still holds it.
  ASSERT_EQ(0, setenv("VORN_WVDIAL_TERM_LINGER", "1", 1));
  ASSERT_TRUE(StartDaemon(daemon_));
  ASSERT_EQ(0, unsetenv("VORN_WVDIAL_TERM_LINGER"));
  ASSERT_TRUE(StartSim(sim_, Scenario(3, R"({"nodes": [{"name": "0"}]})"), 3));
  ASSERT_TRUE(WaitFor([] { return Call("GetUSBModemList").value == "usbmodem3\n"; }, 20));
  for (int round = 1; round <= 3; ++round) {
    SCOPED_TRACE("round " + std::to_string(round));
    if (round > 1) {
      Reply conn = Call("Connect", {"usbmodem3"});
      ASSERT_TRUE(conn.ok) << conn.raw;
    }
    ASSERT_TRUE(WaitFor([] { return NetStatus() == "connected"; }, 60));
    // While the dialler owns the node, queries get no answer.
    EXPECT_EQ(Field(Call("GetUSBModem", {"usbmodem3"}), "sim_status"), "mute");
    const std::size_t before = SimQueries();
    vorntest::SyslogCapture log;
    Reply disc = Call("Disconnect", {"usbmodem3"});
    ASSERT_TRUE(disc.ok) << disc.raw;
    Reply data = Call("GetUSBModem", {"usbmodem3"});
    EXPECT_EQ(Field(data, "sim_status"), "ready") << data.raw << "\n" << log.Dump();
    EXPECT_GT(SimQueries(), before) << "the status query did not reach the node\n" << log.Dump();
    EXPECT_EQ(Field(data, "net_status"), "disconnected");
  }
}
