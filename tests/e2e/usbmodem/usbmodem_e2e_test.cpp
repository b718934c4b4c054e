// End-to-end scenarios of the USB modem daemon: the real vornusbmodemd under the time seam
// (x10: a polling tick is 1 s), the modem simulator behind /dev/ttyUSB*, the real wvdial through
// its wrapper with the fake pppd, and gdbus as the client.
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <fstream>
#include <string>
#include <thread>
#include <vector>

#include "e2e_support.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"

using namespace usbmodem_e2e;

namespace {

const char kUnmapped[] = "org.freedesktop.DBus.GLib.UnmappedError.";
const std::string kNotFound = std::string(kUnmapped) + "Error.Code4294967295";
const char kProfile[] = "/var/lib/usbmodem/usbmodem.profile.262011234567890";
const char kWvdialLog[] = "/var/lib/usbmodem/wvdial.log.262011234567890";
const char kPidFile[] = "/tmp/usbmodem.pid.3";

std::string Field(const Reply& r, const std::string& key) {
  std::string v;
  ParseJson(r.value, key, &v);
  return v;
}

std::string NetStatus() { return Field(Call("GetUSBModem", {"usbmodem3"}), "net_status"); }

int Count(const std::string& text, const std::string& key) {
  int n = 0;
  for (auto p = text.find(key); p != std::string::npos; p = text.find(key, p + 1)) ++n;
  return n;
}

bool HasCommand(int info, const std::string& needle) {
  for (auto& c : TranscriptCommands(info)) {
    if (c.find(needle) != std::string::npos) return true;
  }
  return false;
}

class UsbmodemE2E : public ::testing::Test {
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
  void StartAll(const std::string& extra) {
    ASSERT_TRUE(StartDaemon(daemon_));
    ASSERT_TRUE(StartSim(sim_, Scenario(3, extra), 3));
  }
  bool Listed(double timeout = 20) {
    return WaitFor([] { return Call("GetUSBModemList").value == "usbmodem3\n"; }, timeout);
  }
  Child daemon_;
  Child sim_;
};

TEST_F(UsbmodemE2E, RegistryFollowsTheInformationFiles) {
  ASSERT_TRUE(StartDaemon(daemon_));
  Reply empty = Call("GetUSBModemList");
  ASSERT_TRUE(empty.ok) << empty.raw;
  EXPECT_EQ(empty.value, "");
  // Names that are not exactly usbmodem.info<N> create nothing.
  for (const char* bad : {"/tmp/usbmodem.info03", "/tmp/usbmodem.info3x", "/tmp/usbmodem.info",
                          "/tmp/usbmodem.info-4"}) {
    vorntest::WriteFile(bad, "USB_VENDOR=12d1\nUSB_PRODUCT=1001\n");
  }
  ASSERT_TRUE(StartSim(sim_, Scenario(3, R"({"sim": {"state": "pin", "lock": true}})"), 3));
  // Within one tick (1 s here) plus the initialisation.
  EXPECT_TRUE(Listed(8)) << Call("GetUSBModemList").raw;
  std::this_thread::sleep_for(std::chrono::seconds(3));
  EXPECT_EQ(Call("GetUSBModemList").value, "usbmodem3\n");

  Reply unknown = Call("GetUSBModem", {"usbmodem9"});
  EXPECT_FALSE(unknown.ok);
  EXPECT_EQ(unknown.errorName, kNotFound);
  EXPECT_EQ(unknown.errorMessage, "USBModem [usbmodem9] not found");

  sim_.Stop();  // removes /tmp/usbmodem.info3
  EXPECT_TRUE(WaitFor([] { return Call("GetUSBModemList").value.empty(); }, 8));
  Reply gone = Call("GetSimInfo", {"usbmodem3"});
  EXPECT_EQ(gone.errorMessage, "USBModem [usbmodem3] not found");
  EXPECT_TRUE(daemon_.Alive());
}

TEST_F(UsbmodemE2E, ReadySimAutoConnectsOnceWithTheExactDiallerArguments) {
  StartAll("{}");
  ASSERT_TRUE(Listed());
  ASSERT_TRUE(WaitFor([] { return ReadPid(kPidFile) > 0; }, 20)) << "no dialler started";
  pid_t dialler = ReadPid(kPidFile);
  std::vector<std::string> argv = ProcCmdline(dialler);
  auto at = std::find(argv.begin(), argv.end(), "/usr/bin/wvdial");
  ASSERT_NE(at, argv.end()) << "cmdline of " << dialler;
  std::vector<std::string> args(at + 1, argv.end());
  std::vector<std::string> expected = {"Init1=ATZ",          "Baud=460800",
                                       "Modem=/dev/ttyUSB0", "Phone=*99***1#",
                                       "Username=Unknown",   "Password=Unknown",
                                       "Stupid Mode=1"};
  EXPECT_EQ(args, expected);

  ASSERT_TRUE(WaitFor([] { return NetStatus() == "connected"; }, 40))
      << Call("GetUSBModem", {"usbmodem3"}).raw << vorntest::ReadFile(kWvdialLog);
  Reply data = Call("GetUSBModem", {"usbmodem3"});
  EXPECT_EQ(Field(data, "ifname"), "ppp0");
  EXPECT_EQ(Field(data, "ip"), "10.64.64.64");
  EXPECT_FALSE(Field(data, "mask").empty());
  EXPECT_EQ(Field(data, "id"), "usbmodem3");
  EXPECT_EQ(vorntest::FileMode(kWvdialLog), 0600);

  // The profile of the SIM, with its default keys.
  EXPECT_EQ(vorntest::FileMode(kProfile), 0600);
  std::string profile = vorntest::ReadFile(kProfile);
  for (const char* line : {"number=*99***1#", "user=Unknown", "pass=Unknown",
                           "IMSI=262011234567890", "default_gw=false", "apn=web.vodafone.de"}) {
    EXPECT_NE(profile.find(line), std::string::npos) << line << " in\n" << profile;
  }
  // default_gw false: the dialler gets no default route.
  EXPECT_NE(vorntest::ReadFile("/etc/ppp/peers/wvdial").find("nodefaultroute"),
            std::string::npos);

  EXPECT_EQ(Call("GetUSBModemIfList").value, "ppp0\n");
  EXPECT_EQ(Call("GetDevIdByIfName", {"ppp0"}).value, "usbmodem3");
  EXPECT_EQ(Call("GetDevIdByIfName", {"ppp7"}).value, "");

  // Once in a modem's life: later ticks leave the running dialler alone.
  std::this_thread::sleep_for(std::chrono::seconds(3));
  EXPECT_EQ(ReadPid(kPidFile), dialler);

  // A profile change on the connected modem: down, stored, APN written back, dialled again.
  Reply set = Call("SetProfile", {"usbmodem3",
                                  R"({"default_gw": true, "apn": "internet.t-d1.de", "number": "*99***1#"})"});
  ASSERT_TRUE(set.ok) << set.raw;
  EXPECT_TRUE(HasCommand(3, "AT+CGDCONT=1,\"ip\",\"internet.t-d1.de\""));
  EXPECT_EQ(vorntest::ReadFile("/etc/ppp/peers/wvdial").find("nodefaultroute"),
            std::string::npos);
  EXPECT_NE(vorntest::ReadFile(kProfile).find("apn=internet.t-d1.de"), std::string::npos);
  pid_t redial = ReadPid(kPidFile);
  EXPECT_GT(redial, 0);
  EXPECT_NE(redial, dialler);
  EXPECT_TRUE(WaitFor([] { return NetStatus() == "connected"; }, 40));

  // Text that is not JSON: the link goes down first and stays down.
  Reply bad = Call("SetProfile", {"usbmodem3", "this is not json"});
  EXPECT_FALSE(bad.ok);
  EXPECT_EQ(bad.errorName, kNotFound);
  EXPECT_EQ(bad.errorMessage, "Failed to read profile string");
  EXPECT_FALSE(vorntest::Exists(kPidFile));
  std::this_thread::sleep_for(std::chrono::seconds(3));
  EXPECT_EQ(NetStatus(), "disconnected");
  EXPECT_FALSE(vorntest::Exists(kPidFile));

  // Disconnect with no dialler fails; the state stays.
  Reply disc = Call("Disconnect", {"usbmodem3"});
  EXPECT_EQ(disc.errorMessage, "Failed to disconnect [usbmodem3]");
  EXPECT_EQ(NetStatus(), "disconnected");

  // A user Connect dials again; Disconnect stops it and the daemon ends leaving a dialler up.
  Reply conn = Call("Connect", {"usbmodem3"});
  EXPECT_TRUE(conn.ok) << conn.raw;
  // Connect answers once the dialler runs; the link is read with GetUSBModem.
  EXPECT_EQ(NetStatus(), "connecting");
  EXPECT_TRUE(WaitFor([] { return NetStatus() == "connected"; }, 40));
  pid_t last = ReadPid(kPidFile);
  daemon_.Stop();
  EXPECT_EQ(kill(last, 0), 0) << "the dialler outlives the daemon";
}

TEST_F(UsbmodemE2E, PinProtectedSimIsNeverDialledAndUnlocksWithItsPin) {
  StartAll(R"({"sim": {"state": "pin", "lock": true}})");
  ASSERT_TRUE(Listed());
  std::this_thread::sleep_for(std::chrono::seconds(3));
  EXPECT_FALSE(vorntest::Exists(kPidFile));
  EXPECT_FALSE(HasCommand(3, "ATD"));

  Reply info = Call("GetSimInfo", {"usbmodem3"});
  ASSERT_TRUE(info.ok) << info.raw;
  EXPECT_EQ(Field(info, "sim_status"), "pin_protect");
  EXPECT_EQ(Field(info, "pin_protected"), "true");
  EXPECT_EQ(Field(info, "pin_remains"), "3");

  // A Connect on a locked SIM fails; after a failed NetConnect the link reads connection_lost.
  Reply conn = Call("Connect", {"usbmodem3"});
  EXPECT_EQ(conn.errorName, kNotFound);
  EXPECT_EQ(conn.errorMessage, "Failed to connect [usbmodem3]");
  EXPECT_EQ(NetStatus(), "connection_lost");

  Reply wrong = Call("UnlockSIM", {"usbmodem3", "0000"});
  EXPECT_FALSE(wrong.ok);
  EXPECT_EQ(wrong.errorName, std::string(kUnmapped) + "Error.Code2");
  EXPECT_EQ(wrong.errorMessage, "Failed to unlock PIN [usbmodem3]");
  EXPECT_EQ(Field(Call("GetSimInfo", {"usbmodem3"}), "pin_remains"), "2");

  // A PIN that would smuggle a second command onto the line is refused before sending.
  Reply smuggle = Call("UnlockSIM", {"usbmodem3", "1234\r\nAT+CFUN=0"});
  EXPECT_FALSE(smuggle.ok);
  EXPECT_EQ(smuggle.errorName, std::string(kUnmapped) + "Error.Code1");
  EXPECT_EQ(smuggle.errorMessage, "Failed to unlock PIN [usbmodem3]");
  EXPECT_FALSE(HasCommand(3, "CFUN=0"));
  EXPECT_EQ(Field(Call("GetSimInfo", {"usbmodem3"}), "pin_remains"), "2");

  // A modem that does not answer: code 1.
  ASSERT_TRUE(vorntest::WriteFile("/tmp/modem-sim.3.ctl", "silence 0 on\nsilence 1 on\n"));
  std::this_thread::sleep_for(std::chrono::milliseconds(500));
  Reply dead = Call("UnlockSIM", {"usbmodem3", "1234"});
  EXPECT_EQ(dead.errorName, std::string(kUnmapped) + "Error.Code1") << dead.raw;
  EXPECT_EQ(dead.errorMessage, "Failed to unlock PIN [usbmodem3]");
  ASSERT_TRUE(vorntest::WriteFile("/tmp/modem-sim.3.ctl", "silence 0 off\nsilence 1 off\n"));
  std::this_thread::sleep_for(std::chrono::milliseconds(500));

  Reply right = Call("UnlockSIM", {"usbmodem3", "1234"});
  EXPECT_TRUE(right.ok) << right.raw;
  EXPECT_EQ(Field(Call("GetSimInfo", {"usbmodem3"}), "sim_status"), "ready");
  EXPECT_TRUE(vorntest::Exists(kProfile));
  // Unlocked but protected: still never dialled automatically.
  std::this_thread::sleep_for(std::chrono::seconds(3));
  EXPECT_FALSE(vorntest::Exists(kPidFile));

  // SetPIN: new PIN with protection kept; then protection off.
  Reply setpin = Call("SetPIN", {"usbmodem3", "1234", "4321"}, "true");
  EXPECT_TRUE(setpin.ok) << setpin.raw;
  EXPECT_TRUE(HasCommand(3, "AT+CPWD=\"SC\",\"1234\",\"4321\""));
  Reply off = Call("SetPIN", {"usbmodem3", "4321", ""}, "false");
  EXPECT_TRUE(off.ok) << off.raw;
  EXPECT_EQ(Field(Call("GetSimInfo", {"usbmodem3"}), "pin_protected"), "false");
  Reply badOld = Call("SetPIN", {"usbmodem3", "9999", "1111"}, "true");
  EXPECT_EQ(badOld.errorName, std::string(kUnmapped) + "Error.Code2");
  EXPECT_EQ(badOld.errorMessage, "Failed to set PIN [usbmodem3]");
}

TEST_F(UsbmodemE2E, ThreeWrongPinsNeedThePuk) {
  StartAll(R"({"sim": {"state": "pin", "lock": true}})");
  ASSERT_TRUE(Listed());
  for (int i = 0; i < 3; ++i) {
    EXPECT_EQ(Call("UnlockSIM", {"usbmodem3", "0000"}).errorName,
              std::string(kUnmapped) + "Error.Code2");
  }
  Reply info = Call("GetSimInfo", {"usbmodem3"});
  EXPECT_EQ(Field(info, "sim_status"), "puk_protect") << info.raw;
  Reply wrongPuk = Call("UnlockPIN", {"usbmodem3", "00000000", "1111"});
  EXPECT_EQ(wrongPuk.errorName, std::string(kUnmapped) + "Error.Code2");
  EXPECT_EQ(wrongPuk.errorMessage, "Failed to unlock PIN [usbmodem3]");
  Reply quoted = Call("UnlockPIN", {"usbmodem3", "12345678\"", "1111"});
  EXPECT_EQ(quoted.errorName, std::string(kUnmapped) + "Error.Code1");
  EXPECT_FALSE(HasCommand(3, "12345678\""));
  Reply puk = Call("UnlockPIN", {"usbmodem3", "12345678", "1111"});
  EXPECT_TRUE(puk.ok) << puk.raw;
  EXPECT_EQ(Field(Call("GetSimInfo", {"usbmodem3"}), "sim_status"), "ready");
}

TEST_F(UsbmodemE2E, NoCarrierEndsAutoConnectAfterThreeAndAUserConnectAfterOne) {
  StartAll(R"({"dial": ["NO CARRIER"]})");
  ASSERT_TRUE(Listed());
  ASSERT_TRUE(WaitFor([] { return ReadPid(kPidFile) > 0; }, 20));
  pid_t dialler = ReadPid(kPidFile);
  // The tick does not look at a modem that is no longer new: without GetUSBModem the dialler
  // keeps redialling through several ticks.
  ASSERT_TRUE(WaitFor([] { return Count(vorntest::ReadFile(kWvdialLog), "NO CARRIER") >= 3; },
                      60));
  std::this_thread::sleep_for(std::chrono::seconds(3));
  EXPECT_EQ(kill(dialler, 0), 0);
  EXPECT_EQ(ReadPid(kPidFile), dialler);
  // GetUSBModem moves the dial forward between ticks; three NO CARRIER give it up.
  ASSERT_TRUE(WaitFor([] { return NetStatus() == "disconnected" && !vorntest::Exists(kPidFile); },
                      90))
      << vorntest::ReadFile(kWvdialLog);
  EXPECT_GE(Count(vorntest::ReadFile(kWvdialLog), "NO CARRIER"), 3);

  Reply conn = Call("Connect", {"usbmodem3"});
  ASSERT_TRUE(conn.ok) << conn.raw;  // success once the dialler runs
  ASSERT_TRUE(WaitFor([] { return NetStatus() == "disconnected" && !vorntest::Exists(kPidFile); },
                      60))
      << vorntest::ReadFile(kWvdialLog);
  std::string log = vorntest::ReadFile(kWvdialLog);
  EXPECT_GE(Count(log, "NO CARRIER"), 1);
  EXPECT_LT(Count(log, "NO CARRIER"), 3) << log;
}

TEST_F(UsbmodemE2E, BusySimIsPickedUpAtALaterTick) {
  vorntest::SyslogCapture syslog;
  StartAll(R"({"sim": {"state": "pin", "lock": true, "busy_queries": 3}})");
  EXPECT_TRUE(Listed(20));
  EXPECT_FALSE(syslog.Matching("Failed to init info \\[3\\]").empty()) << syslog.Dump();
}

TEST_F(UsbmodemE2E, OnePortDongleHandsItsNodeToTheDialler) {
  StartAll(R"({"nodes": [{"name": "0"}]})");
  ASSERT_TRUE(Listed());
  ASSERT_TRUE(WaitFor([] { return NetStatus() == "connected"; }, 60))
      << vorntest::ReadFile(kWvdialLog);
  Reply data = Call("GetUSBModem", {"usbmodem3"});
  EXPECT_EQ(Field(data, "sim_status"), "mute") << data.raw;
  std::vector<std::string> argv = ProcCmdline(ReadPid(kPidFile));
  EXPECT_NE(std::find(argv.begin(), argv.end(), "Modem=/dev/ttyUSB0"), argv.end());
  Reply disc = Call("Disconnect", {"usbmodem3"});
  EXPECT_TRUE(disc.ok) << disc.raw;
  EXPECT_EQ(Field(Call("GetUSBModem", {"usbmodem3"}), "sim_status"), "ready");
  EXPECT_EQ(NetStatus(), "disconnected");
}

TEST_F(UsbmodemE2E, BadInputGetsItsErrorAndTheDaemonStaysUp) {
  StartAll(R"({"sim": {"state": "pin", "lock": true}})");
  ASSERT_TRUE(Listed());
  const std::vector<std::string> devids = {"", "usbmodem", "usbmodem03", "\x01;rm -rf /",
                                           std::string(4000, 'x')};
  for (auto& d : devids) {
    for (const char* m : {"Connect", "Disconnect", "GetUSBModem", "GetSimInfo", "GetProfile"}) {
      Reply r = Call(m, {d});
      EXPECT_FALSE(r.ok) << m;
      EXPECT_EQ(r.errorName, kNotFound) << m << " " << r.raw;
      EXPECT_EQ(r.errorMessage, "USBModem [" + d + "] not found") << m;
    }
    EXPECT_EQ(Call("UnlockSIM", {d, "1234"}).errorName, kNotFound);
    EXPECT_EQ(Call("SetPIN", {d, "1234", "1"}, "true").errorName, kNotFound);
    EXPECT_EQ(Call("SetProfile", {d, "{}"}).errorName, kNotFound);
    EXPECT_EQ(Call("UnlockPIN", {d, "1", "2"}).errorName, kNotFound);
    Reply byIf = Call("GetDevIdByIfName", {d});
    EXPECT_TRUE(byIf.ok);
    EXPECT_EQ(byIf.value, "");
  }
  // Garbage for the right modem.
  for (const char* pin : {"", "12\n34", "\"", "12\x7f"}) {
    Reply r = Call("UnlockSIM", {"usbmodem3", pin});
    EXPECT_FALSE(r.ok) << pin;
    EXPECT_EQ(r.errorMessage, "Failed to unlock PIN [usbmodem3]");
  }
  Reply profile = Call("SetProfile", {"usbmodem3", R"({"apn": "x\"\r\nAT+CFUN=0", "number": "*99#"})"});
  EXPECT_FALSE(profile.ok);
  EXPECT_EQ(profile.errorMessage, "Failed to set profile");
  Reply number = Call("SetProfile", {"usbmodem3", R"({"number": "*99#;ATH"})"});
  EXPECT_EQ(number.errorMessage, "Failed to set profile");
  Reply array = Call("SetProfile", {"usbmodem3", R"([1, 2, {"a": []}])"});
  EXPECT_EQ(array.errorMessage, "Failed to set profile");
  Reply nested = Call("SetProfile", {"usbmodem3", R"({"apn": {"x": 1}})"});
  EXPECT_EQ(nested.errorMessage, "Failed to set profile");
  EXPECT_FALSE(HasCommand(3, "CFUN=0"));
  EXPECT_FALSE(HasCommand(3, "ATH"));
  EXPECT_TRUE(daemon_.Alive());
  EXPECT_EQ(Call("GetUSBModemList").value, "usbmodem3\n");
}

TEST_F(UsbmodemE2E, SecondDaemonRefusesToStartAndSigtermEndsTheLoop) {
  ASSERT_TRUE(StartDaemon(daemon_));
  pid_t pid = daemon_.pid();
  EXPECT_EQ(ReadPid("/var/run/vornusbmodemd.pid"), pid);
  vorntest::RunResult second =
      vorntest::Run({vorntest::BinaryDir() + "/daemons/vornusbmodemd/vornusbmodemd"}, "", 20);
  EXPECT_EQ(second.status, 1) << second.err;
  EXPECT_TRUE(daemon_.Alive());
  EXPECT_EQ(Call("GetUSBModemList").value, "");
  kill(pid, SIGTERM);
  EXPECT_EQ(daemon_.Wait(10), 0);
  EXPECT_FALSE(vorntest::Exists("/var/run/vornusbmodemd.pid"));
}

}  // namespace
