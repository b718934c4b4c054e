// SIM handler and dial profile against the modem simulator: real pseudo-terminals, the real node
// handler and dialect, the SIM's own PIN/PUK counters. Asserts the commands the dongle received,
// the SIM's state afterwards, the profile file's bytes and mode, and the exact log lines.
//
// The binary runs under vorn-timewarp (see sim.cmake): the real one-second waits of the
// unlock sequence and the node hand-over pass three times faster.
#include "vornwireless/usbmodem_lib/usbmodem_simhandler.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <sstream>
#include <vector>

#include "support/syslog_capture.h"
#include "fixtures/modem_sim.h"
#include "support/test_util.h"
#include "vornwireless/usbmodem_lib/usbmodem_atif.h"

using vornwireless::usbmodem_lib::USBModem_SIMHandler;
using namespace vornwireless::usbmodem_lib;  // SIM_STATUS values
using vorntest::LogLine;
using vorntest::ReadFile;
using vorntest::SyslogCapture;
using vorntest::WriteFile;

namespace {

const char kSimFile[] = "usbmodem_lib/usbmodem_simhandler.cpp";
const char kProfileFile[] = "usbmodem_lib/usbmodem_simhandler_profile.cpp";
const char kProfilePath[] = "/var/lib/usbmodem/usbmodem.profile.262011234567890";
const char kListPath[] = "/usr/share/usbmodem/wcdma_list.json";
const unsigned kIfid = 1;

// A log line of ours that begins with message (the rest of the line is free).
std::string LogPrefix(std::string const& file, std::string const& message) {
  std::string re = LogLine(file, message);
  re.pop_back();  // the closing "$"
  return re;
}

Json::Value ParseJson(std::string const& text) {
  Json::Value v;
  Json::CharReaderBuilder b;
  std::string errs;
  std::istringstream in(text);
  Json::parseFromStream(b, in, &v, &errs);
  return v;
}

// The scenario of a plain 3GPP stick with a ready SIM; tests change what they need.
Json::Value BaseScenario() {
  return ParseJson(R"({
    "vendor": "1c9e", "product": "9603", "prefix": "/dev/ttySIM", "nodes": [{"name": "0"}],
    "epinc": true, "imsi": "262011234567890", "operator": "Vorn Mobile",
    "manufacturer": "VornTel", "model": "VT-100", "signal": 20,
    "contexts": [{"cid": 1, "type": "IP", "apn": "internet"}],
    "sim": {"state": "ready", "pin": "1234", "puk": "12345678"}
  })");
}

// One simulated dongle (tests/fixtures/modem-sim) for the life of the object, with a mark in its
// transcript so that a test can look at the commands of one step.
class Dongle {
 public:
  explicit Dongle(Json::Value const& scenario, unsigned info = kIfid) {
    // Generous: the clocks run faster than the interpreter starts.
    ready_ = sim_.Start(scenario, static_cast<int>(info), 60000);
  }
  ~Dongle() { sim_.Stop(60000); }
  Dongle(Dongle const&) = delete;
  Dongle& operator=(Dongle const&) = delete;

  bool ready() const { return ready_; }

  // AT commands received since the last Mark().
  std::vector<std::string> Commands() const {
    std::vector<std::string> all = sim_.CommandsOn();
    if (mark_ >= all.size()) return {};
    return std::vector<std::string>(all.begin() + static_cast<long>(mark_), all.end());
  }
  void Mark() { mark_ = sim_.CommandsOn().size(); }
  bool Received(std::string const& cmd) const {
    for (auto const& c : Commands()) {
      if (c == cmd) return true;
    }
    return false;
  }
  bool ReceivedPrefix(std::string const& prefix) const {
    for (auto const& c : Commands()) {
      if (c.compare(0, prefix.size(), prefix) == 0) return true;
    }
    return false;
  }
  Json::Value State() const { return sim_.State(); }
  bool Control(std::string const& line) { return sim_.Control(line, 60000); }

 private:
  vorntest::ModemSim sim_;
  bool ready_ = false;
  size_t mark_ = 0;
};

std::string Profile(std::string const& number, std::string const& user, std::string const& pass,
                    std::string const& location, std::string const& apn,
                    std::string const& isp, std::string const& gw = "false") {
  return "[USBModem Profile]\nnumber=" + number + "\nuser=" + user + "\npass=" + pass +
         "\nIMSI=262011234567890\ndefault_gw=" + gw + "\nlocation=" + location +
         "\napn=" + apn + "\nisp=" + isp + "\n";
}

const char kNetworkList[] = R"([
  {"id": "us", "isp": [{"name": "Other Net"}]},
  {"id": "de", "isp": [{"name": "Vorn"}, {"name": "Vorn Mobile"}]}
])";

class SimHandlerTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    vorntest::Run({"/bin/rm", "-rf", "/var/lib/usbmodem", "/usr/share/usbmodem"});
    mkdir("/usr/share/usbmodem", 0755);
    WriteFile(kListPath, kNetworkList);
  }

  // A handler initialised against a dongle with a ready SIM.
  void InitReady(Dongle& dongle, USBModem_SIMHandler& h) {
    ASSERT_TRUE(dongle.ready());
    ASSERT_EQ(0, h.InitHandler(kIfid));
    ASSERT_EQ(SIM_READY, h.GetPINStatusValue());
  }
};

// ---- initialisation ----

TEST_F(SimHandlerTest, InitOfReadySimPowersRadioAndCreatesDefaultProfile) {
  Json::Value scn = BaseScenario();
  scn["cfun"] = 0;
  Dongle dongle(scn);
  ASSERT_TRUE(dongle.ready());
  USBModem_SIMHandler h;
  ASSERT_EQ(0, h.InitHandler(kIfid));
  EXPECT_TRUE(dongle.Received("AT+CFUN?"));
  EXPECT_TRUE(dongle.Received("AT+CFUN=1"));
  EXPECT_EQ(1, dongle.State()["cfun"].asInt());
  EXPECT_EQ(std::string(kProfilePath), h.GetProfilePath());
  EXPECT_EQ(Profile("*99***1#", "Unknown", "Unknown", "de", "internet", "Vorn Mobile - internet"),
            ReadFile(kProfilePath));
  EXPECT_EQ(0600, vorntest::FileMode(kProfilePath));
  EXPECT_EQ(0775, vorntest::FileMode("/var/lib/usbmodem"));

  // The caches were filled by the init sequence: no further queries for them.
  dongle.Mark();
  bool error = false;
  EXPECT_EQ("VT-100", h.GetProductName(error));
  EXPECT_EQ("VornTel", h.GetVendorName(error));
  EXPECT_EQ("Vorn Mobile", h.GetDefaultISP(error));
  EXPECT_EQ("internet", h.GetDefaultAPN(error));
  EXPECT_EQ("262011234567890", h.GetIMSI(error));
  EXPECT_FALSE(error);
  EXPECT_TRUE(dongle.Commands().empty());
}

TEST_F(SimHandlerTest, ExistingProfileIsKeptAtInit) {
  mkdir("/var/lib/usbmodem", 0700);
  std::string mine = Profile("*99***2#", "alice", "secret", "", "my.apn", "Mine");
  WriteFile(kProfilePath, mine, 0644);
  Dongle dongle(BaseScenario());
  USBModem_SIMHandler h;
  InitReady(dongle, h);
  EXPECT_EQ(mine, ReadFile(kProfilePath));
  EXPECT_EQ(0600, vorntest::FileMode(kProfilePath));
  EXPECT_EQ(0700, vorntest::FileMode("/var/lib/usbmodem"));
}

TEST_F(SimHandlerTest, InitOfPinLockedSimWaitsForPinWithoutInitSequence) {
  Json::Value scn = BaseScenario();
  scn["sim"]["state"] = "pin";
  Dongle dongle(scn);
  ASSERT_TRUE(dongle.ready());
  USBModem_SIMHandler h;
  EXPECT_EQ(0, h.InitHandler(kIfid));
  EXPECT_FALSE(dongle.ReceivedPrefix("AT+CFUN"));
  EXPECT_FALSE(dongle.Received("AT+CIMI"));
  EXPECT_FALSE(vorntest::Exists("/var/lib/usbmodem"));
  bool error = false;
  EXPECT_EQ("pin_protect", h.GetPINStatus(error));
  EXPECT_FALSE(error);
}

TEST_F(SimHandlerTest, InitOfPukLockedAndFailedSims) {
  {
    Json::Value scn = BaseScenario();
    scn["sim"]["state"] = "puk";
    Dongle dongle(scn);
    ASSERT_TRUE(dongle.ready());
    USBModem_SIMHandler h;
    EXPECT_EQ(0, h.InitHandler(kIfid));
    bool error = false;
    EXPECT_EQ("puk_protect", h.GetPINStatus(error));
    EXPECT_FALSE(error);
  }
  {
    Json::Value scn = BaseScenario();
    scn["sim"]["state"] = "failure";
    Dongle dongle(scn);
    ASSERT_TRUE(dongle.ready());
    USBModem_SIMHandler h;
    EXPECT_EQ(0, h.InitHandler(kIfid));
    EXPECT_EQ(SIM_FAILURE, h.GetPINStatusValue());
    bool error = false;
    EXPECT_EQ("no_sim", h.GetPINStatus(error));
    EXPECT_FALSE(error);
  }
}

TEST_F(SimHandlerTest, InitOfBusyOrErroneousSimFails) {
  {
    // BUSY already at the probe of the node: the node handler delays the init.
    Json::Value scn = BaseScenario();
    scn["sim"]["busy_queries"] = 1;
    scn["sim"]["busy_reply"] = "BUSY";
    Dongle dongle(scn);
    ASSERT_TRUE(dongle.ready());
    SyslogCapture log;
    USBModem_SIMHandler h;
    EXPECT_EQ(-1, h.InitHandler(kIfid));
    EXPECT_TRUE(log.HasOnce(LOG_ERR,
                            LogLine(kSimFile, "failed to setup sub handler in sim handler init")))
        << log.Dump();
  }
  {
    // The probe passes; the SIM's own status then reports an error.
    Json::Value scn = BaseScenario();
    scn["sim"]["busy_queries"] = 2;
    scn["sim"]["busy_reply"] = "+CME ERROR: 14";
    Dongle dongle(scn);
    ASSERT_TRUE(dongle.ready());
    SyslogCapture log;
    USBModem_SIMHandler h;
    EXPECT_EQ(-1, h.InitHandler(kIfid));
    EXPECT_EQ(SIM_ERROR, h.GetPINStatusValue());
    EXPECT_TRUE(log.HasOnce(LOG_ERR,
                            LogLine(kSimFile, "Warning: sim error or busy detected when init")))
        << log.Dump();
    EXPECT_FALSE(dongle.ReceivedPrefix("AT+CFUN"));
  }
}

TEST_F(SimHandlerTest, InitWithSilentDongleReadsMuteAndFails) {
  Json::Value scn = BaseScenario();
  scn["nodes"][0]["silent"] = true;
  Dongle dongle(scn);
  ASSERT_TRUE(dongle.ready());
  SyslogCapture log;
  USBModem_SIMHandler h;
  EXPECT_EQ(-1, h.InitHandler(kIfid));
  EXPECT_EQ(SIM_MUTE, h.GetPINStatusValue());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSimFile, "Warning: sim mute before handler init")))
      << log.Dump();
}

TEST_F(SimHandlerTest, InitWithoutVendorFails) {
  WriteFile("/tmp/usbmodem.info7", "USB_PRODUCT=1001\nDEVICENODE_PREFIX=/dev/ttyX\nDEVICENODE=0\n");
  SyslogCapture log;
  USBModem_SIMHandler h;
  EXPECT_EQ(-1, h.InitHandler(7));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSimFile,
                                           "Cannot parsing USB_VENDOR from /tmp/usbmodem.info7")))
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR,
                          LogLine(kSimFile, "failed to setup sub handler in sim handler init")));
  EXPECT_EQ(nullptr, h.GetATIF());
  EXPECT_EQ(nullptr, h.GetNodeHandler());
  // Without sub-handlers nothing answers, and nothing crashes.
  bool error = false;
  EXPECT_EQ("no_sim", h.GetPINStatus(error));
  EXPECT_TRUE(error);
  EXPECT_EQ(-1, h.PINUnlock("1234"));
  EXPECT_EQ(-1, h.GetPINEnable());
  unlink("/tmp/usbmodem.info7");
}

TEST_F(SimHandlerTest, CfunNotSupportedIsSkipped) {
  Json::Value scn = BaseScenario();
  scn["cfun_supported"] = false;
  Dongle dongle(scn);
  SyslogCapture log;
  USBModem_SIMHandler h;
  InitReady(dongle, h);
  EXPECT_FALSE(dongle.Received("AT+CFUN=1"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSimFile,
                                           "Not support AT+CFUN?, skip setting hardware function lvl")))
      << log.Dump();
}

TEST_F(SimHandlerTest, HuaweiDialectSwitchesUnsolicitedReportsOff) {
  Json::Value scn = BaseScenario();
  scn["vendor"] = "12d1";
  scn["product"] = "1001";
  scn["curc"] = 1;
  Dongle dongle(scn);
  USBModem_SIMHandler h;
  InitReady(dongle, h);
  EXPECT_TRUE(dongle.Received("AT^CURC?"));
  EXPECT_TRUE(dongle.Received("AT^CURC=0"));
  EXPECT_EQ(0, dongle.State()["curc"].asInt());
  EXPECT_EQ(3, h.PINGetAttemptRemain());
  EXPECT_EQ(10, h.PUKGetAttemptRemain());

  // Already off: only the question is asked.
  dongle.Mark();
  EXPECT_EQ(0, h.SetUnsolicitedReports(false));
  EXPECT_EQ(std::vector<std::string>{"AT^CURC?"}, dongle.Commands());
}

TEST_F(SimHandlerTest, BaseDialectSkipsUnsolicitedReports) {
  Dongle dongle(BaseScenario());
  SyslogCapture log;
  USBModem_SIMHandler h;
  InitReady(dongle, h);
  EXPECT_TRUE(log.HasOnce(LOG_ERR,
                          LogLine(kSimFile, "skip unsolicited reports setting, not supported")))
      << log.Dump();
}

// ---- PIN and PUK ----

TEST_F(SimHandlerTest, UnlockOnReadySimSucceedsWithoutSendingPin) {
  Dongle dongle(BaseScenario());
  USBModem_SIMHandler h;
  InitReady(dongle, h);
  dongle.Mark();
  EXPECT_EQ(0, h.PINUnlock("9999"));
  EXPECT_EQ(std::vector<std::string>{"AT+CPIN?"}, dongle.Commands());
  EXPECT_EQ(3, dongle.State()["sim"]["pin_attempts"].asInt());
}

TEST_F(SimHandlerTest, WrongPinReturnsRefusedAndSkipsInit) {
  Json::Value scn = BaseScenario();
  scn["sim"]["state"] = "pin";
  Dongle dongle(scn);
  ASSERT_TRUE(dongle.ready());
  USBModem_SIMHandler h;
  ASSERT_EQ(0, h.InitHandler(kIfid));
  SyslogCapture log;
  dongle.Mark();
  EXPECT_EQ(-2, h.PINUnlock("0000"));
  EXPECT_EQ((std::vector<std::string>{"AT+CPIN?", "AT+CPIN=0000"}), dongle.Commands());
  EXPECT_EQ(1u, log.Matching(LogPrefix(kSimFile, "Cannot find OK in respond of PIN unlock, ret: "))
                    .size())
      << log.Dump();

  bool error = false;
  Json::Value info = h.GetSimInfo(error);
  EXPECT_FALSE(error);
  EXPECT_EQ("pin_protect", info["sim_status"].asString());
  EXPECT_EQ(Json::Value("true"), info["pin_protected"]);
  EXPECT_EQ(2, info["pin_remains"].asInt());
  EXPECT_EQ(10, info["puk_remains"].asInt());
  EXPECT_FALSE(vorntest::Exists(kProfilePath));
}

TEST_F(SimHandlerTest, ThreeWrongPinsEndInPukProtectAndPukRecovers) {
  Json::Value scn = BaseScenario();
  scn["sim"]["state"] = "pin";
  Dongle dongle(scn);
  ASSERT_TRUE(dongle.ready());
  USBModem_SIMHandler h;
  ASSERT_EQ(0, h.InitHandler(kIfid));
  EXPECT_EQ(-2, h.PINUnlock("1111"));
  EXPECT_EQ(-2, h.PINUnlock("2222"));
  EXPECT_EQ(-2, h.PINUnlock("3333"));
  bool error = false;
  Json::Value info = h.GetSimInfo(error);
  EXPECT_EQ("puk_protect", info["sim_status"].asString());
  EXPECT_EQ(0, info["pin_remains"].asInt());
  EXPECT_EQ(10, info["puk_remains"].asInt());
  // A PIN is no use any more.
  EXPECT_EQ(-2, h.PINUnlock("1234"));

  // A wrong PUK is refused by the SIM and costs one attempt.
  EXPECT_EQ(-2, h.PUKSet("00000000", "4321"));
  EXPECT_EQ(9, dongle.State()["sim"]["puk_attempts"].asInt());
  EXPECT_EQ("puk_protect", h.GetPINStatus(error));

  dongle.Mark();
  EXPECT_EQ(0, h.PUKSet("12345678", "4321"));
  EXPECT_TRUE(dongle.Received("AT+CPIN=12345678,4321"));
  EXPECT_TRUE(dongle.Received("AT+CFUN=1"));
  EXPECT_EQ("ready", dongle.State()["sim"]["state"].asString());
  EXPECT_EQ("4321", dongle.State()["sim"]["pin"].asString());
  EXPECT_EQ("ready", h.GetPINStatus(error));
  EXPECT_FALSE(error);
  EXPECT_TRUE(vorntest::Exists(kProfilePath));
}

TEST_F(SimHandlerTest, RightPinUnlocksAndRunsInitSequence) {
  Json::Value scn = BaseScenario();
  scn["sim"]["state"] = "pin";
  Dongle dongle(scn);
  ASSERT_TRUE(dongle.ready());
  USBModem_SIMHandler h;
  ASSERT_EQ(0, h.InitHandler(kIfid));
  dongle.Mark();
  EXPECT_EQ(0, h.PINUnlock("1234"));
  EXPECT_TRUE(dongle.Received("AT+CPIN=1234"));
  EXPECT_TRUE(dongle.Received("AT+CFUN=1"));
  EXPECT_TRUE(dongle.Received("AT+CIMI"));
  EXPECT_EQ(Profile("*99***1#", "Unknown", "Unknown", "de", "internet", "Vorn Mobile - internet"),
            ReadFile(kProfilePath));
  bool error = false;
  Json::Value info = h.GetSimInfo(error);
  EXPECT_EQ("ready", info["sim_status"].asString());
  EXPECT_EQ(Json::Value("true"), info["pin_protected"]);
  EXPECT_EQ(3, info["pin_remains"].asInt());
}

TEST_F(SimHandlerTest, PukSetOutsidePukStateSendsNothing) {
  Dongle dongle(BaseScenario());
  USBModem_SIMHandler h;
  InitReady(dongle, h);
  SyslogCapture log;
  dongle.Mark();
  EXPECT_EQ(-1, h.PUKSet("12345678", "1234"));
  EXPECT_FALSE(dongle.ReceivedPrefix("AT+CPIN="));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSimFile, "Cannot set PUK at this SIM stat")))
      << log.Dump();
}

TEST_F(SimHandlerTest, SetPinChangesProtectionAndCode) {
  Dongle dongle(BaseScenario());  // ready, lock off
  USBModem_SIMHandler h;
  InitReady(dongle, h);
  EXPECT_EQ(0, h.GetPINEnable());
  EXPECT_EQ(0, h.PINGetEnableProtection());

  dongle.Mark();
  EXPECT_EQ(0, h.PINSet("1234", "", true));
  EXPECT_TRUE(dongle.Received("AT+CLCK=\"SC\",1,\"1234\""));
  EXPECT_TRUE(dongle.State()["sim"]["lock"].asBool());
  EXPECT_EQ(1, h.GetPINEnable());

  // Asking for the state it already has sends no change.
  dongle.Mark();
  EXPECT_EQ(0, h.PINSet("1234", "", true));
  EXPECT_EQ(std::vector<std::string>{"AT+CLCK=\"SC\",2"}, dongle.Commands());

  // A wrong PIN is refused by the SIM.
  EXPECT_EQ(-2, h.PINSet("0000", "", false));
  EXPECT_TRUE(dongle.State()["sim"]["lock"].asBool());
  EXPECT_EQ(2, dongle.State()["sim"]["pin_attempts"].asInt());

  // Protection off and a new code in one call.
  dongle.Mark();
  EXPECT_EQ(0, h.PINSet("1234", "5678", false));
  EXPECT_TRUE(dongle.Received("AT+CLCK=\"SC\",0,\"1234\""));
  EXPECT_TRUE(dongle.Received("AT+CPWD=\"SC\",\"1234\",\"5678\""));
  EXPECT_FALSE(dongle.State()["sim"]["lock"].asBool());
  EXPECT_EQ("5678", dongle.State()["sim"]["pin"].asString());
  bool error = false;
  EXPECT_EQ("false", h.GetSimInfo(error)["pin_protected"].asString());
}

TEST_F(SimHandlerTest, ChangePinWithRefusedOldPinReturnsRefused) {
  Dongle dongle(BaseScenario());
  USBModem_SIMHandler h;
  InitReady(dongle, h);
  SyslogCapture log;
  EXPECT_EQ(-2, h.ChangePIN("0000", "5678"));
  EXPECT_EQ("1234", dongle.State()["sim"]["pin"].asString());
  EXPECT_EQ(1u, log.Matching(LogPrefix(kSimFile, "error on changing PIN, ret: ")).size())
      << log.Dump();

  log.Clear();
  dongle.Mark();
  EXPECT_EQ(-1, h.ChangePIN("1234", ""));
  EXPECT_TRUE(log.HasOnce(LOG_ERR,
                          LogLine(kSimFile, "error on change pin: input args should not be null")));
  EXPECT_TRUE(dongle.Commands().empty());
}

TEST_F(SimHandlerTest, PinOperationsOnLockedSimNeedReadySim) {
  Json::Value scn = BaseScenario();
  scn["sim"]["state"] = "pin";
  Dongle dongle(scn);
  ASSERT_TRUE(dongle.ready());
  USBModem_SIMHandler h;
  ASSERT_EQ(0, h.InitHandler(kIfid));
  SyslogCapture log;
  EXPECT_EQ(-1, h.PINSet("1234", "", false));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSimFile, "Cannot change enable when SIM is not ready")))
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSimFile, "failed on PIN enable")));
  EXPECT_EQ(-1, h.ChangePIN("1234", "5678"));
  EXPECT_FALSE(dongle.ReceivedPrefix("AT+CLCK=\"SC\","));
  EXPECT_FALSE(dongle.ReceivedPrefix("AT+CPWD"));
}

TEST_F(SimHandlerTest, RefusedCharactersNeverReachTheModem) {
  Json::Value scn = BaseScenario();
  scn["sim"]["state"] = "pin";
  Dongle dongle(scn);
  ASSERT_TRUE(dongle.ready());
  USBModem_SIMHandler h;
  ASSERT_EQ(0, h.InitHandler(kIfid));
  dongle.Mark();
  EXPECT_EQ(-1, h.PINUnlock("1234\r\nAT+CFUN=0"));
  EXPECT_EQ(-1, h.PINUnlock("12\"34"));
  EXPECT_EQ(-1, h.PINUnlock("1234;+CFUN=0"));
  EXPECT_EQ(-1, h.PINUnlock(std::string("12\x01" "4")));
  EXPECT_EQ(-1, h.PUKSet("12345678\n", "1234"));
  EXPECT_EQ(-1, h.PUKSet("12345678", "12\"4"));
  EXPECT_EQ(-1, h.PINSet("1234\r", "", true));
  EXPECT_EQ(-1, h.ChangePIN("1234", "56\n78"));
  EXPECT_EQ(-1, h.ChangePINEnable("\x7f", false));
  EXPECT_TRUE(dongle.Commands().empty());
  EXPECT_EQ(3, dongle.State()["sim"]["pin_attempts"].asInt());
  EXPECT_EQ("pin", dongle.State()["sim"]["state"].asString());
}

TEST_F(SimHandlerTest, PinProtectedIsTextTrueAlsoWhenModemIsSilent) {
  Dongle dongle(BaseScenario());
  USBModem_SIMHandler h;
  InitReady(dongle, h);
  bool error = false;
  Json::Value info = h.GetSimInfo(error);
  ASSERT_TRUE(info["pin_protected"].isString());
  EXPECT_EQ("false", info["pin_protected"].asString());

  ASSERT_TRUE(dongle.Control("silence 0 on"));
  SyslogCapture log;
  dongle.Mark();
  error = false;
  info = h.GetSimInfo(error);
  EXPECT_TRUE(error);
  EXPECT_EQ("no_sim", info["sim_status"].asString());
  ASSERT_TRUE(info["pin_protected"].isString());
  EXPECT_EQ("true", info["pin_protected"].asString());
  EXPECT_EQ(-1, info["pin_remains"].asInt());
  EXPECT_EQ(-1, info["puk_remains"].asInt());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSimFile, "error value on _PINStatus, 7"))) << log.Dump();
  // Status 7: the attempts are not asked for.
  EXPECT_FALSE(dongle.Received("AT+EPINC?"));
}

TEST_F(SimHandlerTest, UnknownDialectWithoutAttemptQueryGivesMinusOne) {
  Json::Value scn = BaseScenario();
  scn["epinc"] = false;
  Dongle dongle(scn);
  USBModem_SIMHandler h;
  InitReady(dongle, h);
  SyslogCapture log;
  EXPECT_EQ(-1, h.PINGetAttemptRemain());
  EXPECT_EQ(-1, h.PUKGetAttemptRemain());
  EXPECT_EQ(2u, log.Matching(LogPrefix(kSimFile, "error on parsing AT command ret string: ")).size())
      << log.Dump();
}

TEST_F(SimHandlerTest, UnlockFailsWhenSimStaysNotReadyForTenSeconds) {
  Json::Value scn = BaseScenario();
  scn["sim"]["state"] = "pin";
  scn["sim"]["ready_after"] = 1000;
  Dongle dongle(scn);
  ASSERT_TRUE(dongle.ready());
  USBModem_SIMHandler h;
  ASSERT_EQ(0, h.InitHandler(kIfid));
  SyslogCapture log;
  EXPECT_EQ(-1, h.PINUnlock("1234"));
  // The SIM took the PIN all the same.
  EXPECT_EQ("ready", dongle.State()["sim"]["state"].asString());
  for (int round = 1; round <= 10; ++round) {
    EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSimFile, "Wait for sim ready after pin unlocked (" +
                                                           std::to_string(round) + ")")));
  }
  EXPECT_TRUE(log.HasOnce(
      LOG_ERR, LogLine(kSimFile, "pin unlocked, but sim card is not ready, or has error status")));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSimFile, "failed on init after pin locked")))
      << log.Dump();
  EXPECT_FALSE(dongle.ReceivedPrefix("AT+CFUN"));
}

TEST_F(SimHandlerTest, SlowSimIsWaitedFor) {
  Json::Value scn = BaseScenario();
  scn["sim"]["state"] = "pin";
  scn["sim"]["ready_after"] = 3;
  Dongle dongle(scn);
  ASSERT_TRUE(dongle.ready());
  USBModem_SIMHandler h;
  ASSERT_EQ(0, h.InitHandler(kIfid));
  SyslogCapture log;
  EXPECT_EQ(0, h.PINUnlock("1234"));
  EXPECT_EQ(3u, log.Matching(LogPrefix(kSimFile, "Wait for sim ready after pin unlocked")).size())
      << log.Dump();
  EXPECT_TRUE(vorntest::Exists(kProfilePath));
}

// ---- reports ----

TEST_F(SimHandlerTest, USBModemDataOfReadyAndLockedSim) {
  Dongle dongle(BaseScenario());
  USBModem_SIMHandler h;
  InitReady(dongle, h);
  bool error = false;
  Json::Value data = h.GetUSBModemData(error);
  EXPECT_FALSE(error);
  EXPECT_EQ("VT-100", data["product"].asString());
  EXPECT_EQ("VornTel", data["vendor"].asString());
  EXPECT_EQ(64, data["signal"].asInt());  // rssi 20 of 31
  EXPECT_EQ("Vorn Mobile", data["carrier"].asString());
  EXPECT_EQ("ready", data["sim_status"].asString());
  EXPECT_EQ(ParseJson(R"([{"number": "*99***1#", "apn": "internet"}])"),
            data["default_apn_list"]);
  EXPECT_EQ("internet", data["profile"]["apn"].asString());
  EXPECT_EQ(Json::Value(false), data["profile"]["default_gw"]);
  EXPECT_EQ("false", h.GetRoaming(error));

  ASSERT_TRUE(dongle.Control("sim state \"pin\""));
  error = false;
  data = h.GetUSBModemData(error);
  EXPECT_FALSE(error);
  EXPECT_EQ(ParseJson(R"({"product": "", "vendor": "", "signal": 0, "carrier": "",
                          "sim_status": "pin_protect", "default_apn_list": [], "profile": {}})"),
            data);
  // A locked SIM has an all-empty profile, though its file is there.
  Json::Value profile = h.GetProfile(error);
  EXPECT_FALSE(error);
  EXPECT_EQ(ParseJson(R"({"apn": "", "number": "", "user": "", "pass": "", "IMSI": "",
                          "location": "", "isp": "", "default_gw": false})"),
            profile);
}

// ---- ownership of the sub-handlers ----

TEST_F(SimHandlerTest, CopiesKeepWorkingSubHandlersThroughRelocationAndErase) {
  Dongle dongle(BaseScenario());
  std::vector<USBModem_SIMHandler> list;
  list.emplace_back();
  InitReady(dongle, list[0]);
  auto* atif = list[0].GetATIF();
  auto* nodes = list[0].GetNodeHandler();
  for (int i = 0; i < 40; ++i) list.push_back(list[0]);  // several relocations
  list.erase(list.begin());                               // moves every later copy down
  list.erase(list.begin() + 5, list.begin() + 20);
  for (auto const& h : list) {
    EXPECT_EQ(atif, h.GetATIF());
    EXPECT_EQ(nodes, h.GetNodeHandler());
  }
  bool error = false;
  EXPECT_EQ("ready", list.back().GetPINStatus(error));
  EXPECT_FALSE(error);

  // A copy that lets its share go leaves the others working.
  list.front().UnsetSubHandler();
  EXPECT_EQ(nullptr, list.front().GetATIF());
  EXPECT_EQ("ready", list[1].GetPINStatus(error));

  // Assigning over a handler drops its old sub-handlers; the last one standing still works.
  USBModem_SIMHandler other;
  other = list[1];
  list.clear();
  EXPECT_EQ("ready", other.GetPINStatus(error));
  EXPECT_FALSE(error);
}

// ---- profile ----

TEST_F(SimHandlerTest, NewSimWithoutNetworkListGetsProfileWithEmptyLocation) {
  unlink(kListPath);
  Dongle dongle(BaseScenario());
  SyslogCapture log;
  USBModem_SIMHandler h;
  InitReady(dongle, h);
  EXPECT_EQ(Profile("*99***1#", "Unknown", "Unknown", "", "internet", "Vorn Mobile - internet"),
            ReadFile(kProfilePath));
  EXPECT_EQ(1u, log.Matching(LogLine(kProfileFile,
                                     "Failed to parse json file [/usr/share/usbmodem/wcdma_list.json]"))
                    .size())
      << log.Dump();
  bool error = false;
  EXPECT_EQ("", h.GetDefaultLocation(error));
  EXPECT_TRUE(error);
}

TEST_F(SimHandlerTest, LocationComesFromTheNetworkListWhateverItsShape) {
  Dongle dongle(BaseScenario());
  USBModem_SIMHandler h;
  InitReady(dongle, h);
  struct Case {
    const char* list;
    const char* location;
    bool error;
  } cases[] = {
      {R"({"id": "de", "isp": [{"name": "Vorn Mobile"}]})", "", false},  // not an array
      {R"([1, "x", null, {"id": {"a": 1}, "isp": [{"name": "Vorn Mobile"}]},
          {"id": "no-isp"}, {"id": "bad-isp", "isp": {"name": "Vorn Mobile"}},
          {"id": "bad-names", "isp": [1, [], {"name": ["Vorn Mobile"]}, {"name": 5}]},
          {"id": 49, "isp": [{"name": "Vorn Mobile"}]}])",
       "49", false},
      {R"([{"id": "xx", "isp": [{"name": "vorn mobile"}, {"name": "Vorn Mobile "}]}])", "", false},
      {"[1, 2", "", true},
      {"", "", true},
  };
  for (auto const& c : cases) {
    WriteFile(kListPath, c.list);
    bool error = false;
    std::string location;
    EXPECT_NO_THROW(location = h.GetDefaultLocation(error)) << c.list;
    EXPECT_EQ(c.location, location) << c.list;
    EXPECT_EQ(c.error, error) << c.list;
  }
}

TEST_F(SimHandlerTest, SetProfileWithTwoDigitContextStoresAndWritesNothingToModem) {
  Dongle dongle(BaseScenario());
  USBModem_SIMHandler h;
  InitReady(dongle, h);
  SyslogCapture log;
  dongle.Mark();
  EXPECT_EQ(0, h.SetProfile(ParseJson(R"({"number": "*99***12#", "apn": "other.apn",
                                          "user": "bob", "default_gw": true})")));
  EXPECT_TRUE(dongle.Commands().empty());
  EXPECT_EQ(Profile("*99***12#", "bob", "Unknown", "de", "other.apn", "Vorn Mobile - internet",
                    "true"),
            ReadFile(kProfilePath));
  EXPECT_EQ(0600, vorntest::FileMode(kProfilePath));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kProfileFile,
                                           "cannot recognize input phone format (*99***12#), skip write APN")))
      << log.Dump();
  bool error = false;
  EXPECT_EQ("other.apn", h.GetDefaultAPN(error));
  Json::Value profile = h.GetProfile(error);
  EXPECT_FALSE(error);
  EXPECT_EQ(Json::Value(true), profile["default_gw"]);
  EXPECT_EQ("bob", profile["user"].asString());
  EXPECT_EQ("262011234567890", profile["IMSI"].asString());
}

TEST_F(SimHandlerTest, SetProfileWritesApnBackWhenContextDiffers) {
  Dongle dongle(BaseScenario());
  USBModem_SIMHandler h;
  InitReady(dongle, h);
  dongle.Mark();
  EXPECT_EQ(0, h.SetProfile(ParseJson(R"({"number": "*99***1#", "apn": "web.example"})")));
  EXPECT_EQ((std::vector<std::string>{"AT+CGDCONT?", "AT+CGDCONT=1,\"ip\",\"web.example\""}),
            dongle.Commands());
  EXPECT_EQ("web.example", dongle.State()["contexts"][0]["apn"].asString());

  // The same APN again: the modem is only asked.
  dongle.Mark();
  EXPECT_EQ(0, h.SetProfile(ParseJson(R"({"number": "*99***1#", "apn": "web.example"})")));
  EXPECT_EQ(std::vector<std::string>{"AT+CGDCONT?"}, dongle.Commands());
}

TEST_F(SimHandlerTest, ShortNumberStaysInProfileAndChecksContextOne) {
  Dongle dongle(BaseScenario());
  USBModem_SIMHandler h;
  InitReady(dongle, h);
  dongle.Mark();
  EXPECT_EQ(0, h.SetProfile(ParseJson(R"({"number": "*99#", "apn": "internet"})")));
  EXPECT_EQ(std::vector<std::string>{"AT+CGDCONT?"}, dongle.Commands());
  bool error = false;
  EXPECT_EQ("*99#", h.GetProfileWithKey("number", error));
  EXPECT_FALSE(error);

  dongle.Mark();
  EXPECT_EQ(0, h.SetProfile(ParseJson(R"({"number": "*99#", "apn": "fast.net"})")));
  EXPECT_TRUE(dongle.Received("AT+CGDCONT=1,\"ip\",\"fast.net\""));
}

TEST_F(SimHandlerTest, RefusedProfilesChangeNothing) {
  Dongle dongle(BaseScenario());
  USBModem_SIMHandler h;
  InitReady(dongle, h);
  std::string const before = ReadFile(kProfilePath);
  dongle.Mark();
  const char* refused[] = {
      R"([1, 2])",
      R"("text")",
      R"({"user": "carol", "pass": ["x"]})",
      R"({"user": "carol", "isp": {"a": 1}})",
      R"({"user": "carol", "pass": "a\nb"})",
      R"({"user": "carol", "=x": "1"})",
      R"({"user": "carol", "": "1"})",
      R"({"number": "*99***1#", "apn": "evil\"\r\nAT+CFUN=0"})",
      R"({"number": "*99***1#\r", "apn": "internet"})",
      R"({"number": "*99***1#", "apn": "a;+CFUN=0"})",
  };
  for (const char* text : refused) {
    int ret = 0;
    EXPECT_NO_THROW(ret = h.SetProfile(ParseJson(text))) << text;
    EXPECT_EQ(-1, ret) << text;
  }
  std::string const longValue(2000, 'x');
  Json::Value big(Json::objectValue);
  big["user"] = "carol";
  big["pass"] = longValue;
  EXPECT_EQ(-1, h.SetProfile(big));
  EXPECT_EQ(before, ReadFile(kProfilePath));
  EXPECT_TRUE(dongle.Commands().empty());
  bool error = false;
  EXPECT_EQ("internet", h.GetDefaultAPN(error));
}

TEST_F(SimHandlerTest, EmptyApnIsRefusedAfterStoring) {
  Dongle dongle(BaseScenario());
  USBModem_SIMHandler h;
  InitReady(dongle, h);
  SyslogCapture log;
  EXPECT_EQ(-1, h.SetProfile(ParseJson(R"({"number": "*99***1#", "apn": ""})")));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kProfileFile, "input should not be empty string")));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kProfileFile, "Failed to write apn back to sim card")))
      << log.Dump();
}

TEST_F(SimHandlerTest, HandEditedProfilesGiveReadFailuresNotCrashes) {
  Dongle dongle(BaseScenario());
  USBModem_SIMHandler h;
  InitReady(dongle, h);
  bool error = false;

  // Keys missing, junk lines, no line ends, binary noise: absent keys read as empty.
  WriteFile(kProfilePath, std::string("garbage\x01\xff\n[USBModem Profile]\nuser\n==\napn=x\n"
                                      "[other]\nnumber=1\n\0\0bin", 62), 0600);
  Json::Value profile;
  EXPECT_NO_THROW(profile = h.GetProfile(error));
  EXPECT_FALSE(error);
  EXPECT_EQ("x", profile["apn"].asString());
  EXPECT_EQ("", profile["number"].asString());
  EXPECT_EQ(Json::Value(false), profile["default_gw"]);

  // A value longer than the key buffer cannot be read: the read fails.
  WriteFile(kProfilePath, "[USBModem Profile]\nnumber=" + std::string(1500, '9') + "\napn=x\n",
            0600);
  SyslogCapture log;
  error = false;
  profile = h.GetProfile(error);
  EXPECT_TRUE(error);
  EXPECT_EQ("", profile["number"].asString());
  EXPECT_EQ("x", profile["apn"].asString());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kProfileFile,
                                           "failed on get key value [" + std::string(kProfilePath) +
                                               "] [USBModem Profile] [number]")))
      << log.Dump();

  // The file gone, or a directory in its place.
  unlink(kProfilePath);
  error = false;
  profile = h.GetProfile(error);
  EXPECT_TRUE(error);
  EXPECT_EQ("", profile["apn"].asString());
  mkdir(kProfilePath, 0700);
  error = false;
  EXPECT_NO_THROW(profile = h.GetProfile(error));
  EXPECT_TRUE(error);
  EXPECT_EQ(-1, h.SetProfile(ParseJson(R"({"user": "x"})")));
  rmdir(kProfilePath);

  // A write after the file vanished makes it again, with the profile's mode.
  EXPECT_EQ(0, h.SetProfile(ParseJson(R"({"user": "dave"})")));
  EXPECT_EQ("[USBModem Profile]\nuser=dave\n", ReadFile(kProfilePath));
  EXPECT_EQ(0600, vorntest::FileMode(kProfilePath));
}

TEST_F(SimHandlerTest, ResetProfileRewritesDefaults) {
  Dongle dongle(BaseScenario());
  USBModem_SIMHandler h;
  InitReady(dongle, h);
  EXPECT_EQ(0, h.SetProfile(ParseJson(R"({"user": "erin", "extra": 5})")));
  EXPECT_NE(std::string::npos, ReadFile(kProfilePath).find("extra=5\n"));
  EXPECT_EQ(0, h.ResetProfile());
  EXPECT_EQ(Profile("*99***1#", "Unknown", "Unknown", "de", "internet", "Vorn Mobile - internet"),
            ReadFile(kProfilePath));
}

TEST_F(SimHandlerTest, ProfileOfMuteSimIsReadFromFile) {
  Dongle dongle(BaseScenario());
  USBModem_SIMHandler h;
  InitReady(dongle, h);
  ASSERT_EQ(0, h.SetProfile(ParseJson(R"({"user": "frank"})")));
  // A one-port dongle lends its only node to the dialler: every command answers empty.
  std::string node;
  EXPECT_EQ(0, h.GetConnectNode(node));
  EXPECT_EQ("/dev/ttySIM0", node);
  bool error = false;
  Json::Value data = h.GetUSBModemData(error);
  EXPECT_EQ("mute", data["sim_status"].asString());
  EXPECT_EQ("frank", data["profile"]["user"].asString());
  EXPECT_EQ("internet", data["profile"]["apn"].asString());
  EXPECT_EQ("VT-100", data["product"].asString());
  EXPECT_EQ(64, data["signal"].asInt());  // the stored value
  EXPECT_EQ(-1, h.PINGetAttemptRemain());
  h.ReleaseConnectNode();
  error = false;
  EXPECT_EQ("ready", h.GetPINStatus(error));
}

}  // namespace

namespace {

TEST_F(SimHandlerTest, ShippedNetworkListGivesLocation) {
  std::string const shipped = ReadFile(vorntest::SourceDir() + "/dist/usbmodem/wcdma_list.json");
  ASSERT_FALSE(shipped.empty());
  ASSERT_TRUE(ParseJson(shipped).isArray());
  WriteFile(kListPath, shipped);
  Json::Value scn = BaseScenario();
  scn["operator"] = "Vodafone.de";
  Dongle dongle(scn);
  USBModem_SIMHandler h;
  InitReady(dongle, h);
  EXPECT_EQ(Profile("*99***1#", "Unknown", "Unknown", "de", "internet", "Vodafone.de - internet"),
            ReadFile(kProfilePath));
}

TEST_F(SimHandlerTest, ImsiThatIsNoNumberNamesNoProfile) {
  Json::Value scn = BaseScenario();
  scn["imsi"] = "../../../etc/evil";
  Dongle dongle(scn);
  ASSERT_TRUE(dongle.ready());
  SyslogCapture log;
  USBModem_SIMHandler h;
  EXPECT_EQ(-1, h.InitHandler(kIfid));
  EXPECT_TRUE(log.HasOnce(LOG_ERR,
                          LogLine(kProfileFile, "Error on init profile: failed to get imsi")))
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSimFile, "failed on init profile")));
  EXPECT_EQ("", h.GetProfilePath());
  EXPECT_FALSE(vorntest::Exists("/etc/evil"));
  EXPECT_FALSE(vorntest::Exists("/var/lib/usbmodem"));
}

TEST_F(SimHandlerTest, ApnIsNotWrittenToLockedSim) {
  Dongle dongle(BaseScenario());
  USBModem_SIMHandler h;
  InitReady(dongle, h);
  ASSERT_TRUE(dongle.Control("sim state \"pin\""));
  bool error = false;
  EXPECT_EQ("pin_protect", h.GetPINStatus(error));
  SyslogCapture log;
  dongle.Mark();
  EXPECT_EQ(-1, h.SetProfile(ParseJson(R"({"number": "*99***1#", "apn": "web.example"})")));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kProfileFile,
                                           "this shouldn't call if pin status is not ready (1)")))
      << log.Dump();
  EXPECT_FALSE(dongle.ReceivedPrefix("AT+CGDCONT"));
  EXPECT_EQ("internet", dongle.State()["contexts"][0]["apn"].asString());
}

}  // namespace
