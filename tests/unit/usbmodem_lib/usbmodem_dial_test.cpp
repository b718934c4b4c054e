// The modem object against the modem simulator: initialisation, the reading of the dialler's
// log, and a dial through a recording stand-in for /usr/bin/wvdial.
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <chrono>
#include <string>
#include <vector>

#include "e2e/usbmodem/e2e_support.h"
#include "fixtures/fake_journal.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "vornwireless/usbmodem_lib/usbmodem.h"
#include "vornwireless/usbmodem_lib/usbmodem_list.h"

using vornwireless::usbmodem_lib::USBModem;
using vornwireless::usbmodem_lib::USBModemList;
using vorntest::LogLine;
using vorntest::SyslogCapture;

namespace {

const char kLog[] = "/var/lib/usbmodem/wvdial.log.262011234567890";

class DialModem : public USBModem {
 public:
  DialModem() : USBModem(3, "/tmp/usbmodem.info3") {}
  void SetAttempts(unsigned n) { _dialAttempts = n; }
  std::string IfName() const { return _ifName; }
};

class USBModemDialTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    usbmodem_e2e::CleanModemState();
  }
  void TearDown() override {
    sim_.Stop();
    usbmodem_e2e::CleanModemState();
  }
  void StartSim(const std::string& extra = "{}") {
    ASSERT_TRUE(usbmodem_e2e::StartSim(sim_, usbmodem_e2e::Scenario(3, extra), 3));
  }
  usbmodem_e2e::Child sim_;
};

TEST_F(USBModemDialTest, ReadySimInitialisesAndReportsItsData) {
  StartSim();
  DialModem modem;
  ASSERT_EQ(modem.InitInfo(), 0);
  EXPECT_TRUE(modem.IsInited());
  bool error = false;
  Json::Value data = modem.GetUSBModemData(error);
  EXPECT_EQ(data["id"].asString(), "usbmodem3");
  EXPECT_EQ(data["net_status"].asString(), "disconnected");
  EXPECT_EQ(data["ifname"].asString(), "");
  EXPECT_EQ(data["sim_status"].asString(), "ready");
  EXPECT_TRUE(data.isMember("profile"));
  EXPECT_TRUE(vorntest::Exists("/var/lib/usbmodem/usbmodem.profile.262011234567890"));
}

TEST_F(USBModemDialTest, TheDiallersLogDecidesAboutTheDial) {
  StartSim();
  DialModem modem;
  ASSERT_EQ(modem.InitInfo(), 0);
  SyslogCapture syslog;

  modem.SetAttempts(3);
  ASSERT_TRUE(vorntest::WriteFile(kLog, ""));
  EXPECT_EQ(modem.AssignConnectInfo(), 2);
  ASSERT_TRUE(vorntest::WriteFile(kLog, "--> NO CARRIER\nNO CARRIER\n"));
  EXPECT_EQ(modem.AssignConnectInfo(), 2);
  ASSERT_TRUE(vorntest::WriteFile(kLog, "NO CARRIER\nNO CARRIER\nNO CARRIER\n"));
  EXPECT_EQ(modem.AssignConnectInfo(), -1);
  EXPECT_TRUE(syslog.HasOnce(LOG_ERR, LogLine("usbmodem_lib/usbmodem.cpp",
                                              "found NO CARRIER (3), cancel the connection")))
      << syslog.Dump();
  ASSERT_TRUE(vorntest::WriteFile(kLog, "Disconnecting\nDisconnecting\nDisconnecting\n"));
  EXPECT_EQ(modem.AssignConnectInfo(), -1);
  EXPECT_TRUE(syslog.HasOnce(LOG_ERR, LogLine("usbmodem_lib/usbmodem.cpp",
                                              "dial attempt (3) reached, cancel the connection")));
  // A user's Connect has a budget of one.
  modem.SetAttempts(1);
  ASSERT_TRUE(vorntest::WriteFile(kLog, "ATDT*99***1#\nNO CARRIER\n"));
  EXPECT_EQ(modem.AssignConnectInfo(), -1);

  modem.SetAttempts(3);
  ASSERT_TRUE(vorntest::WriteFile(kLog, "--> Using interface ppp0\n"));
  EXPECT_EQ(modem.AssignConnectInfo(), 2);
  EXPECT_EQ(modem.IfName(), "");
  ASSERT_TRUE(vorntest::WriteFile(kLog,
                                  "--> pppd: Using interface ppp7\n--> local  IP address 10.1.2.3\n"
                                  "--> primary   DNS address 10.11.12.1\n"));
  EXPECT_EQ(modem.AssignConnectInfo(), 1);
  EXPECT_EQ(modem.IfName(), "ppp7");

  unlink(kLog);
  syslog.Clear();
  EXPECT_EQ(modem.AssignConnectInfo(), -1);
  EXPECT_TRUE(syslog.HasOnce(LOG_ERR, LogLine("usbmodem_lib/usbmodem.cpp",
                                              std::string("Error on file ") + kLog +
                                                  ", not exist")));
}

TEST_F(USBModemDialTest, DialRunsWvdialWithItsArgumentsInOrderAndUnknownForEmptyUser) {
  ASSERT_TRUE(vorntest::InstallFake("/usr/bin/wvdial"));
  vorntest::ClearFakeJournal();
  vorntest::Run({"/bin/mkdir", "-p", "/etc/ppp/peers"});
  StartSim();
  DialModem modem;
  ASSERT_EQ(modem.InitInfo(), 0);
  Json::Value profile(Json::objectValue);
  profile["user"] = "";
  profile["pass"] = "";
  ASSERT_EQ(modem.SetProfile(profile), 0);

  // A directory in the pid file's place: the dialler's pid never shows up there, so the wait
  // for the process runs its five rounds and does not fail the dial.
  ASSERT_EQ(mkdir("/tmp/usbmodem.pid.3", 0755), 0);
  SyslogCapture syslog;
  auto start = std::chrono::steady_clock::now();
  EXPECT_EQ(modem.NetConnect(3), 1);
  rmdir("/tmp/usbmodem.pid.3");
  double waited = std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
  // The five rounds are counted by their log lines below; real time only shows they slept.
  EXPECT_GE(waited, 4.5);
  EXPECT_EQ(syslog.Matching("Wait for wvdial process up, sleep 1 sec").size(), 5u)
      << syslog.Dump();
  std::vector<vorntest::FakeCall> calls;
  for (int i = 0; i < 100 && calls.empty(); ++i) {
    calls = vorntest::FakeCallsTo("/usr/bin/wvdial");
    if (calls.empty()) usleep(50000);
  }
  ASSERT_EQ(calls.size(), 1u);
  std::vector<std::string> expected = {"Init1=ATZ",        "Baud=460800",     "Modem=/dev/ttyUSB0",
                                       "Phone=*99***1#",   "Username=Unknown", "Password=Unknown",
                                       "Stupid Mode=1"};
  EXPECT_EQ(calls[0].argv, expected);
  EXPECT_EQ(vorntest::FileMode(kLog), 0600);
  EXPECT_NE(vorntest::ReadFile("/etc/ppp/peers/wvdial").find("nodefaultroute"), std::string::npos);
  EXPECT_EQ(modem.GetPidFile(), "/tmp/usbmodem.pid.3");
  EXPECT_EQ(modem.GetDialAttempts(), 3u);
  EXPECT_EQ(modem.GetDialFailCount(), 0);
  // The next look sees no dialler: disconnected, not lost, since the dial itself started.
  bool error = false;
  EXPECT_TRUE(modem.IsNetDisconnected(error));
  EXPECT_EQ(modem.GetNetStatus(error), "disconnected");
  // And a not-new modem is not dialled again by the tick.
  EXPECT_EQ(modem.NetTryAutoConnect(), -1);
  EXPECT_EQ(vorntest::FakeCallsTo("/usr/bin/wvdial").size(), 1u);
}

TEST_F(USBModemDialTest, ProfileNumberWithControlCharactersIsNotDialled) {
  ASSERT_TRUE(vorntest::InstallFake("/usr/bin/wvdial"));
  vorntest::ClearFakeJournal();
  StartSim();
  DialModem modem;
  ASSERT_EQ(modem.InitInfo(), 0);
  // Edited by hand into the stored profile.
  std::string path = "/var/lib/usbmodem/usbmodem.profile.262011234567890";
  std::string text = vorntest::ReadFile(path);
  auto pos = text.find("number=*99***1#");
  ASSERT_NE(pos, std::string::npos);
  text.replace(pos, std::string("number=*99***1#").size(), "number=*99#\"ATH");
  ASSERT_TRUE(vorntest::WriteFile(path, text, 0600));
  EXPECT_EQ(modem.NetConnect(1), -1);
  EXPECT_TRUE(vorntest::FakeCallsTo("/usr/bin/wvdial").empty());
  EXPECT_EQ(modem.GetDialFailCount(), 1);
}

TEST_F(USBModemDialTest, BusySimAtTheFirstTickIsRetried) {
  StartSim(R"({"sim": {"busy_queries": 2}})");
  USBModemList list;
  EXPECT_EQ(list.Update(), -1);
  ASSERT_EQ(list.size(), 1u);
  EXPECT_EQ(list[0].GetInfoState(), USBModem::INFO_FAILED);
  EXPECT_FALSE(list[0].IsInited());
  int ticks = 0;
  while (!list[0].IsInited() && ticks < 5) {
    list.Update();
    ++ticks;
  }
  EXPECT_TRUE(list[0].IsInited());
}

TEST_F(USBModemDialTest, MuteDongleAtTheFirstTickIsNotListedAndRetried) {
  StartSim(R"({"nodes": [{"name": "0", "silent": true}]})");
  USBModemList list;
  SyslogCapture syslog;
  EXPECT_EQ(list.Update(), -1);
  ASSERT_EQ(list.size(), 1u);
  EXPECT_EQ(list[0].GetInfoState(), USBModem::INFO_FAILED);
  EXPECT_FALSE(syslog.Matching("Warning: sim mute before handler init").empty()) << syslog.Dump();
  ASSERT_TRUE(vorntest::WriteFile("/tmp/modem-sim.3.ctl", "silence 0 off\n"));
  usleep(300000);
  EXPECT_EQ(list.Update(), 0);
  EXPECT_TRUE(list[0].IsInited());
}

TEST_F(USBModemDialTest, PinProtectedSimIsNotAutoConnected) {
  ASSERT_TRUE(vorntest::InstallFake("/usr/bin/wvdial"));
  vorntest::ClearFakeJournal();
  StartSim(R"({"sim": {"state": "ready", "lock": true}})");
  DialModem modem;
  ASSERT_EQ(modem.InitInfo(), 0);
  SyslogCapture syslog;
  EXPECT_EQ(modem.NetTryAutoConnect(), -1);
  EXPECT_TRUE(syslog.HasOnce(LOG_INFO, LogLine("usbmodem_lib/usbmodem.cpp",
                                               "USBModem [3] has pin protect")))
      << syslog.Dump();
  EXPECT_TRUE(vorntest::FakeCallsTo("/usr/bin/wvdial").empty());
  EXPECT_TRUE(modem.IsNewPlugIn());
}

}  // namespace
