// The modem object: identity, copies, the link state derived from the dialler's pid file and the
// interface, the peers file edits, the disconnect and the early failures of a dial.
#include "vornwireless/usbmodem_lib/usbmodem.h"

#include <gtest/gtest.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <string>
#include <thread>

#include "fixtures/fake_journal.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "vornwireless/usbmodem_lib/usbmodem_list.h"

using vornwireless::usbmodem_lib::USBModem;
using vornwireless::usbmodem_lib::USBModemList;
using vornwireless::usbmodem_lib::USBModemNull;
using vorntest::LogLine;
using vorntest::ReadFile;
using vorntest::SyslogCapture;

namespace {

const char kPeers[] = "/etc/ppp/peers/wvdial";

// Reaches the state a running modem would have.
class TestModem : public USBModem {
 public:
  TestModem(unsigned id = 3) : USBModem(id, "/tmp/usbmodem.info" + std::to_string(id)) {}
  void SetLink(std::string const& ifname, std::string const& ip, std::string const& mask) {
    _ifName = ifname;
    _localIP = ip;
    _localMask = mask;
  }
  void SetPidFile(std::string const& p) { _pidFile = p; }
  void SetNetStatus(int s) { _netStatus = s; }
  void SetInfoState(int s) { _infoState = s; }
  void SetBusy(bool b) { _busy = b; }
  void SetDialFailCount(int n) { _dialFailCount = n; }
  std::string IfName() const { return _ifName; }
  std::string LocalIP() const { return _localIP; }
  std::string LocalMask() const { return _localMask; }
  bool Busy() const { return _busy; }
};

// A process standing in for a running dialler, with its pid file.
class FakeDialler {
 public:
  explicit FakeDialler(std::string const& pidFile) : pidFile_(pidFile) {
    pid_ = fork();
    if (pid_ == 0) {
      execl("/bin/sleep", "sleep", "300", static_cast<char*>(nullptr));
      _exit(127);
    }
    vorntest::WriteFile(pidFile_, std::to_string(pid_) + "\n");
  }
  ~FakeDialler() {
    if (pid_ > 0) {
      kill(pid_, SIGKILL);
      waitpid(pid_, nullptr, 0);
    }
    unlink(pidFile_.c_str());
  }
  // True when the process ended (and reaps it).
  bool Ended() {
    for (int i = 0; i < 100; ++i) {
      int status;
      if (waitpid(pid_, &status, WNOHANG) == pid_) {
        pid_ = -1;
        return true;
      }
      std::this_thread::sleep_for(std::chrono::milliseconds(20));
    }
    return false;
  }
  void Kill() {
    kill(pid_, SIGKILL);
    waitpid(pid_, nullptr, 0);
    pid_ = -1;
  }

 private:
  std::string pidFile_;
  pid_t pid_ = -1;
};

class USBModemTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    unlink("/tmp/usbmodem.pid.3");
    vorntest::Run({"/bin/mkdir", "-p", "/etc/ppp/peers"});
    ASSERT_TRUE(vorntest::WriteFile(kPeers, "noauth\nname wvdial\nusepeerdns\n"));
  }
};

TEST_F(USBModemTest, IdentityAndInitialState) {
  USBModem modem(3, "/tmp/usbmodem.info3");
  EXPECT_EQ(modem.GetDevId(), "usbmodem3");
  EXPECT_EQ(modem.GetIfid(), 3u);
  EXPECT_FALSE(modem.IsNull());
  EXPECT_FALSE(modem.IsInited());
  EXPECT_EQ(modem.GetInfoState(), USBModem::INFO_NOT_INITED);
  EXPECT_TRUE(modem.IsNewPlugIn());
  EXPECT_FALSE(modem.IsError());
  EXPECT_EQ(modem.GetNetStatusValue(), USBModem::NET_DISCONNECTED);
  bool error = false;
  EXPECT_EQ(modem.GetNetStatus(error), "disconnected");
  EXPECT_FALSE(error);
  EXPECT_EQ(USBModem(12, "").GetDevId(), "usbmodem12");
}

TEST_F(USBModemTest, InfoExistFollowsTheFile) {
  USBModem modem(3, "/tmp/usbmodem.info3");
  unlink("/tmp/usbmodem.info3");
  EXPECT_FALSE(modem.IsInfoExist());
  ASSERT_TRUE(vorntest::WriteFile("/tmp/usbmodem.info3", "USB_VENDOR=12d1\n"));
  EXPECT_TRUE(modem.IsInfoExist());
  unlink("/tmp/usbmodem.info3");
}

TEST_F(USBModemTest, NullObject) {
  USBModemNull& null = USBModemList::nullObject;
  EXPECT_TRUE(null.IsNull());
  EXPECT_FALSE(null.IsInited());
  EXPECT_FALSE(null.IsInfoExist());
  EXPECT_EQ(null.GetDevId(), "");
  EXPECT_EQ(null.GetIfid(), 0u);
  USBModem& asBase = null;
  EXPECT_TRUE(asBase.IsNull());
}

TEST_F(USBModemTest, MoreThanFiveErrorsDisableAutoConnect) {
  TestModem modem;
  modem.SetInfoState(USBModem::INFO_INITED);
  for (int i = 0; i < 5; ++i) modem.IncreaseErrorCounter();
  EXPECT_FALSE(modem.IsError());
  modem.IncreaseErrorCounter();
  EXPECT_TRUE(modem.IsError());
  SyslogCapture syslog;
  EXPECT_EQ(modem.NetTryAutoConnect(), -1);
  EXPECT_TRUE(syslog.HasOnce(LOG_INFO, LogLine("usbmodem_lib/usbmodem.cpp",
                                               "USBModem [3] is error")))
      << syslog.Dump();
}

TEST_F(USBModemTest, AutoConnectSkipsModemsThatAreNotInitedOrNotNew) {
  TestModem modem;
  SyslogCapture syslog;
  EXPECT_EQ(modem.NetTryAutoConnect(), -1);
  EXPECT_TRUE(syslog.HasOnce(LOG_WARNING, LogLine("usbmodem_lib/usbmodem.cpp",
                                                  "USBModem [3] is not inited")));
  modem.SetInfoState(USBModem::INFO_INITED);
  EXPECT_EQ(modem.NetDisconnect(), -1);  // any disconnect ends the new plug-in state
  EXPECT_FALSE(modem.IsNewPlugIn());
  syslog.Clear();
  EXPECT_EQ(modem.NetTryAutoConnect(), -1);
  EXPECT_TRUE(syslog.HasOnce(LOG_INFO, LogLine("usbmodem_lib/usbmodem.cpp",
                                               "USBModem [3] is not new")));
}

TEST_F(USBModemTest, AutoConnectNeedsAReadySim) {
  TestModem modem;
  modem.SetInfoState(USBModem::INFO_INITED);
  SyslogCapture syslog;
  EXPECT_EQ(modem.NetTryAutoConnect(), -1);
  EXPECT_TRUE(syslog.HasOnce(LOG_INFO, LogLine("usbmodem_lib/usbmodem.cpp",
                                               "USBModem [3] is new plug in")));
  EXPECT_TRUE(syslog.HasOnce(LOG_INFO, LogLine("usbmodem_lib/usbmodem.cpp",
                                               "USBModem [3] pin is not ready")));
  EXPECT_TRUE(modem.IsNewPlugIn());
  EXPECT_EQ(modem.GetErrorCount(), 0);
}

TEST_F(USBModemTest, CopyConstructorStartsWithoutDialStateAssignmentTakesIt) {
  TestModem modem;
  modem.SetLink("ppp0", "10.0.0.1", "255.255.255.255");
  modem.SetPidFile("/tmp/usbmodem.pid.3");
  modem.SetNetStatus(USBModem::NET_CONNECTED);
  modem.IncreaseErrorCounter();
  TestModem copy(modem);
  EXPECT_EQ(copy.IfName(), "");
  EXPECT_EQ(copy.LocalIP(), "");
  EXPECT_EQ(copy.LocalMask(), "");
  EXPECT_EQ(copy.GetPidFile(), "");
  EXPECT_EQ(copy.GetNetStatusValue(), USBModem::NET_CONNECTED);
  EXPECT_EQ(copy.GetErrorCount(), 1);
  EXPECT_EQ(copy.GetDevId(), "usbmodem3");
  TestModem assigned(7);
  assigned = modem;
  EXPECT_EQ(assigned.IfName(), "ppp0");
  EXPECT_EQ(assigned.LocalIP(), "10.0.0.1");
  EXPECT_EQ(assigned.LocalMask(), "255.255.255.255");
  EXPECT_EQ(assigned.GetPidFile(), "/tmp/usbmodem.pid.3");
  EXPECT_EQ(assigned.GetDevId(), "usbmodem3");
}

TEST_F(USBModemTest, KeyCountInTextCountsOverlappingHits) {
  EXPECT_EQ(USBModem::KeyCountInText("aaaa", "aa"), 3);
  EXPECT_EQ(USBModem::KeyCountInText("NO CARRIER\n--> NO CARRIER\nNO CARRIE", "NO CARRIER"), 2);
  EXPECT_EQ(USBModem::KeyCountInText("", "Disconnecting"), 0);
  EXPECT_EQ(USBModem::KeyCountInText("abc", ""), 0);
  EXPECT_EQ(USBModem::KeyCountInText("--> Disconnecting at Sun", "Disconnecting"), 1);
}

TEST_F(USBModemTest, NetStatusStrings) {
  TestModem modem;
  const char* names[] = {"connected", "connecting", "connecting", "disconnected",
                         "connection_lost"};
  for (int s = 0; s <= 4; ++s) {
    modem.SetNetStatus(s);
    bool error = false;
    EXPECT_EQ(modem.GetNetStatus(error), names[s]);
    EXPECT_FALSE(error);
  }
  modem.SetNetStatus(9);
  bool error = false;
  EXPECT_EQ(modem.GetNetStatus(error), "");
  EXPECT_TRUE(error);
}

TEST_F(USBModemTest, InterfaceNameAddressAndMaskOnlyWhenConnected) {
  TestModem modem;
  modem.SetLink("ppp0", "10.64.64.64", "255.255.255.255");
  bool error = false;
  for (int s : {1, 2, 3, 4}) {
    modem.SetNetStatus(s);
    EXPECT_EQ(modem.GetNetIFName(error), "");
    EXPECT_EQ(modem.GetNetLocalIP(error), "");
    EXPECT_EQ(modem.GetNetLocalMask(error), "");
  }
  modem.SetNetStatus(0);
  EXPECT_EQ(modem.GetNetIFName(error), "ppp0");
  EXPECT_EQ(modem.GetNetLocalIP(error), "10.64.64.64");
  EXPECT_EQ(modem.GetNetLocalMask(error), "255.255.255.255");
  EXPECT_FALSE(error);
  Json::Value data = modem.GetUSBModemData(error);
  EXPECT_EQ(data["id"].asString(), "usbmodem3");
  EXPECT_EQ(data["ifname"].asString(), "ppp0");
  EXPECT_EQ(data["ip"].asString(), "10.64.64.64");
  EXPECT_EQ(data["mask"].asString(), "255.255.255.255");
  EXPECT_EQ(data["net_status"].asString(), "connected");
}

TEST_F(USBModemTest, LinkStateFollowsDiallerAndInterface) {
  TestModem modem;
  // No dialler, no failed dial.
  modem.SetNetStatus(USBModem::NET_CONNECTED);
  EXPECT_EQ(modem.GetLinkStats(), 0);
  EXPECT_EQ(modem.GetNetStatusValue(), USBModem::NET_DISCONNECTED);
  modem.SetDialFailCount(2);
  EXPECT_EQ(modem.GetLinkStats(), 0);
  EXPECT_EQ(modem.GetNetStatusValue(), USBModem::NET_CONNECTION_LOST);
  modem.SetDialFailCount(0);

  FakeDialler dialler("/tmp/usbmodem.pid.3");
  EXPECT_TRUE(modem.IsWvdialUp());
  // Dialler runs, interface not known yet.
  EXPECT_EQ(modem.GetLinkStats(), 0);
  EXPECT_EQ(modem.GetNetStatusValue(), USBModem::NET_CONNECTING);
  // The interface with its address: connected.
  modem.SetLink("lo", "", "");
  EXPECT_EQ(modem.GetLinkStats(), 0);
  EXPECT_EQ(modem.GetNetStatusValue(), USBModem::NET_CONNECTED);
  EXPECT_EQ(modem.LocalIP(), "127.0.0.1");
  EXPECT_EQ(modem.LocalMask(), "255.0.0.0");
  // The interface went away: near up, address missing.
  modem.SetLink("nosuch0", "127.0.0.1", "255.0.0.0");
  EXPECT_EQ(modem.GetLinkStats(), 0);
  EXPECT_EQ(modem.GetNetStatusValue(), USBModem::NET_CONNECTING_LOST);
  EXPECT_EQ(modem.LocalIP(), "");
  EXPECT_EQ(modem.LocalMask(), "");
  EXPECT_EQ(modem.GetLinkStats(), 0);
  EXPECT_EQ(modem.GetNetStatusValue(), USBModem::NET_CONNECTING_LOST);
  bool error = false;
  EXPECT_FALSE(modem.IsNetDisconnected(error));
  // The dialler dies by itself after success: disconnected, since the counter was reset.
  dialler.Kill();
  EXPECT_FALSE(modem.IsWvdialUp());
  EXPECT_TRUE(modem.IsNetDisconnected(error));
  EXPECT_EQ(modem.GetNetStatusValue(), USBModem::NET_DISCONNECTED);
  EXPECT_FALSE(error);
}

TEST_F(USBModemTest, ConnectedStateResetsTheFailureCounter) {
  TestModem modem;
  FakeDialler dialler("/tmp/usbmodem.pid.3");
  modem.SetDialFailCount(3);
  modem.SetLink("lo", "", "");
  EXPECT_EQ(modem.UpdateNetStatus(), 1);
  EXPECT_EQ(modem.GetNetStatusValue(), USBModem::NET_CONNECTED);
  EXPECT_EQ(modem.GetDialFailCount(), 0);
}

TEST_F(USBModemTest, StaleOrForeignPidFileIsNotADialler) {
  TestModem modem;
  ASSERT_TRUE(vorntest::WriteFile("/tmp/usbmodem.pid.3", "999999\n"));
  EXPECT_FALSE(modem.IsWvdialUp());
  ASSERT_TRUE(vorntest::WriteFile("/tmp/usbmodem.pid.3", "garbage\n"));
  EXPECT_FALSE(modem.IsWvdialUp());
  unlink("/tmp/usbmodem.pid.3");
}

TEST_F(USBModemTest, DefaultRouteFollowsTheProfile) {
  TestModem modem;
  SyslogCapture syslog;
  EXPECT_EQ(modem.SetDefaultRoute(""), -1);
  EXPECT_TRUE(syslog.HasOnce(LOG_ERR, LogLine("usbmodem_lib/usbmodem.cpp",
                                              "error on input args, should not be zero size")));
  EXPECT_EQ(ReadFile(kPeers), "noauth\nname wvdial\nusepeerdns\n");
  EXPECT_EQ(modem.SetDefaultRoute("false"), 0);
  EXPECT_EQ(ReadFile(kPeers), "noauth\nname wvdial\nusepeerdns\nnodefaultroute\n");
  EXPECT_EQ(modem.SetDefaultRoute("false"), 0);
  EXPECT_EQ(ReadFile(kPeers), "noauth\nname wvdial\nusepeerdns\nnodefaultroute\n");
  EXPECT_EQ(modem.SetDefaultRoute("anything"), 0);
  EXPECT_EQ(ReadFile(kPeers), "noauth\nname wvdial\nusepeerdns\nnodefaultroute\n");
  EXPECT_EQ(modem.SetDefaultRoute("true"), 0);
  EXPECT_EQ(ReadFile(kPeers), "noauth\nname wvdial\nusepeerdns\n");
  EXPECT_EQ(modem.SetDefaultRoute("true"), 0);
  EXPECT_EQ(ReadFile(kPeers), "noauth\nname wvdial\nusepeerdns\n");
}

TEST_F(USBModemTest, DisconnectWithoutPidFileFailsAndKeepsTheState) {
  TestModem modem;
  modem.SetNetStatus(USBModem::NET_CONNECTION_LOST);
  modem.SetLink("ppp0", "10.0.0.1", "255.255.255.255");
  SyslogCapture syslog;
  EXPECT_EQ(modem.NetDisconnect(), -1);
  EXPECT_TRUE(syslog.HasOnce(LOG_ERR,
                             LogLine("usbmodem_lib/usbmodem.cpp",
                                     "failed on disconnect, cannot find pidfile /tmp/usbmodem.pid.3")))
      << syslog.Dump();
  EXPECT_EQ(modem.GetNetStatusValue(), USBModem::NET_CONNECTION_LOST);
  EXPECT_EQ(modem.IfName(), "ppp0");
  EXPECT_FALSE(modem.IsNewPlugIn());
}

TEST_F(USBModemTest, DisconnectStopsTheDiallerAndReloadsTheFirewall) {
  ASSERT_TRUE(vorntest::InstallFake("/usr/vorn/libexec/platform/VORNFwRuleHup"));
  ASSERT_TRUE(vorntest::InstallFake("/usr/vorn/libexec/platform/VORNFwTcRuleHup"));
  vorntest::ClearFakeJournal();
  TestModem modem;
  modem.SetLink("ppp0", "10.0.0.1", "255.255.255.255");
  FakeDialler dialler("/tmp/usbmodem.pid.3");
  EXPECT_EQ(modem.NetDisconnect(), 0);
  EXPECT_TRUE(dialler.Ended());
  EXPECT_FALSE(vorntest::Exists("/tmp/usbmodem.pid.3"));
  EXPECT_EQ(modem.GetPidFile(), "");
  EXPECT_EQ(modem.IfName(), "");
  EXPECT_EQ(modem.LocalIP(), "");
  EXPECT_EQ(modem.LocalMask(), "255.255.255.255");  // the mask stays
  bool reloaded = false;
  for (int i = 0; i < 100 && !reloaded; ++i) {
    reloaded = !vorntest::FakeCallsTo("VORNFwRuleHup").empty() &&
               !vorntest::FakeCallsTo("VORNFwTcRuleHup").empty();
    if (!reloaded) std::this_thread::sleep_for(std::chrono::milliseconds(50));
  }
  EXPECT_TRUE(reloaded);
  auto rule = vorntest::FakeCallsTo("VORNFwRuleHup");
  auto tc = vorntest::FakeCallsTo("VORNFwTcRuleHup");
  ASSERT_EQ(rule.size(), 1u);
  ASSERT_EQ(tc.size(), 1u);
  EXPECT_LE(rule[0].time, tc[0].time);
}

TEST_F(USBModemTest, FailedFirewallReloadIsLoggedWithThePlatformError) {
  ASSERT_TRUE(vorntest::InstallFake("/usr/vorn/libexec/platform/VORNFwRuleHup"));
  ASSERT_TRUE(vorntest::InstallFake("/usr/vorn/libexec/platform/VORNFwTcRuleHup"));
  Json::Value fail(Json::objectValue);
  fail["exit"] = 1;
  ASSERT_TRUE(vorntest::AddFakeReply("/usr/vorn/libexec/platform/VORNFwRuleHup", fail));
  SyslogCapture syslog;
  EXPECT_EQ(USBModem::ReloadFirewall(), 0);
  bool logged = false;
  for (int i = 0; i < 100 && !logged; ++i) {
    logged = !syslog.Matching("reload firewall rules failed \\[0x[0-9A-F]{4} .*:[0-9]+\\]").empty();
    if (!logged) std::this_thread::sleep_for(std::chrono::milliseconds(50));
  }
  EXPECT_TRUE(logged) << syslog.Dump();
  vorntest::WriteFakeReplies(Json::Value(Json::objectValue));
}

TEST_F(USBModemTest, ConnectWithoutReadySimFailsAndCountsTheFailure) {
  TestModem modem;
  SyslogCapture syslog;
  EXPECT_EQ(modem.NetConnect(1), -1);
  EXPECT_TRUE(syslog.HasOnce(LOG_ERR, LogLine("usbmodem_lib/usbmodem.cpp",
                                              "Net connect failed: sim card is not ready")));
  EXPECT_EQ(modem.GetDialFailCount(), 1);
  EXPECT_EQ(modem.GetDialAttempts(), 1u);
  EXPECT_FALSE(modem.IsNewPlugIn());
  EXPECT_FALSE(modem.Busy());
  bool error = false;
  EXPECT_TRUE(modem.IsNetDisconnected(error));
  EXPECT_EQ(modem.GetNetStatus(error), "connection_lost");
}

TEST_F(USBModemTest, ConnectWhileBusyFailsAndClearsBusy) {
  TestModem modem;
  modem.SetBusy(true);
  SyslogCapture syslog;
  EXPECT_EQ(modem.NetConnect(3), -1);
  EXPECT_TRUE(syslog.HasOnce(LOG_ERR, LogLine("usbmodem_lib/usbmodem.cpp",
                                              "error on connection establish when busy")));
  EXPECT_FALSE(modem.Busy());
  EXPECT_EQ(modem.GetDialFailCount(), 1);
  EXPECT_TRUE(modem.IsNewPlugIn());  // the busy path stops before the dial begins
}

TEST_F(USBModemTest, AssignConnectInfoWithoutImsiGivesTheDialUp) {
  TestModem modem;
  SyslogCapture syslog;
  EXPECT_EQ(modem.AssignConnectInfo(), -1);
  EXPECT_FALSE(syslog.Matching("Error on file .*, not exist").empty());
}

}  // namespace

namespace {

TEST_F(USBModemTest, RelocationInTheRegistryKeepsTheDialState) {
  USBModemList list;
  TestModem modem;
  modem.SetLink("ppp0", "10.0.0.1", "255.255.255.255");
  modem.SetNetStatus(USBModem::NET_CONNECTED);
  list.push_back(USBModem(3, ""));
  list[0] = modem;
  for (unsigned i = 10; i < 100; ++i) list.push_back(USBModem(i, ""));  // reallocates
  bool error = false;
  EXPECT_EQ(list[0].GetNetIFName(error), "ppp0");
  EXPECT_EQ(list[0].GetNetLocalIP(error), "10.0.0.1");
  EXPECT_EQ(list[0].GetNetLocalMask(error), "255.255.255.255");
}

}  // namespace
