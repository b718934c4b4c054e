// PINs, PUKs and passwords never reach syslog, and the files that hold them are owner-only from
// their creation on. The real vornusbmodemd under the time seam, the modem simulator, gdbus.
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <iostream>
#include <string>
#include <thread>
#include <vector>

#include "e2e_support.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"

using namespace usbmodem_e2e;

namespace {

const char kProfile[] = "/var/lib/usbmodem/usbmodem.profile.262011234567890";
const char kWvdialLog[] = "/var/lib/usbmodem/wvdial.log.262011234567890";
const char kCtl[] = "/tmp/modem-sim.3.ctl";

// Every secret this test sends (none of them is a substring of the simulator's other texts).
const std::vector<std::string> kSecrets = {"8642", "97531", "24681357", "5791", "86420975",
                                           "3141", "s3cretPa55"};

std::string Field(const Reply& r, const std::string& key) {
  std::string v;
  ParseJson(r.value, key, &v);
  return v;
}

class SecretsE2E : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    ASSERT_TRUE(vorntest::SyslogCapture::Available());
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

TEST_F(SecretsE2E, PinPukAndPasswordsNeverReachSyslogAndTheirFilesAreOwnerOnly) {
  vorntest::SyslogCapture log;
  ASSERT_TRUE(StartDaemon(daemon_));
  ASSERT_TRUE(StartSim(sim_, Scenario(3, R"({"echo": false, "sim": {"state": "pin", "lock": true, "pin": "5791", "puk": "86420975"}})"), 3));
  ASSERT_TRUE(WaitFor([] { return Call("GetUSBModemList").value == "usbmodem3\n"; }, 20));

  // Wrong PINs until the PUK is needed; a wrong PUK; each while the modem answers.
  EXPECT_FALSE(Call("UnlockSIM", {"usbmodem3", "8642"}).ok);
  EXPECT_FALSE(Call("UnlockSIM", {"usbmodem3", "97531"}).ok);
  EXPECT_FALSE(Call("UnlockSIM", {"usbmodem3", "8642"}).ok);
  EXPECT_EQ(Field(Call("GetSimInfo", {"usbmodem3"}), "sim_status"), "puk_protect");
  EXPECT_FALSE(Call("UnlockPIN", {"usbmodem3", "24681357", "8642"}).ok);

  // The same while the modem leaves the secret-carrying commands unanswered (echo is off, so
  // nothing at all comes back): the unanswered command is what gets logged.
  ASSERT_TRUE(vorntest::WriteFile(
      kCtl, "set silent_commands [\"AT+CPIN=\", \"AT+CPWD=\", \"AT+CLCK=\\\"SC\\\",0\", "
            "\"AT+CLCK=\\\"SC\\\",1\"]\n"));
  std::this_thread::sleep_for(std::chrono::milliseconds(500));
  EXPECT_FALSE(Call("UnlockPIN", {"usbmodem3", "86420975", "3141"}).ok);
  ASSERT_TRUE(vorntest::WriteFile(kCtl, "set silent_commands []\n"));
  std::this_thread::sleep_for(std::chrono::milliseconds(500));

  // The right PUK with a new PIN, then a PIN change and a profile with a password.
  Reply puk = Call("UnlockPIN", {"usbmodem3", "86420975", "5791"});
  ASSERT_TRUE(puk.ok) << puk.raw;
  EXPECT_TRUE(Call("SetPIN", {"usbmodem3", "5791", "3141"}, "true").ok);
  ASSERT_TRUE(vorntest::WriteFile(kCtl, "set silent_commands [\"AT+CPWD=\", \"AT+CLCK=\\\"SC\\\",0\"]\n"));
  std::this_thread::sleep_for(std::chrono::milliseconds(500));
  EXPECT_FALSE(Call("SetPIN", {"usbmodem3", "3141", "8642"}, "true").ok);
  EXPECT_FALSE(Call("SetPIN", {"usbmodem3", "3141", ""}, "false").ok);
  ASSERT_TRUE(vorntest::WriteFile(kCtl, "set silent_commands []\n"));
  std::this_thread::sleep_for(std::chrono::milliseconds(500));
  Call("SetProfile", {"usbmodem3", R"({"user": "me", "pass": "s3cretPa55", "number": "*99#"})"});

  // The commands reached the modem, so the log had every chance to show them.
  bool sentPuk = false;
  for (auto& c : TranscriptCommands(3)) {
    if (c.find("24681357") != std::string::npos) sentPuk = true;
  }
  EXPECT_TRUE(sentPuk);
  const std::vector<vorntest::SyslogLine> lines = log.Lines();
  for (const char* cmd : {"AT\\+CPIN=", "AT\\+CPWD=", "AT\\+CLCK=\"SC\",[01],"}) {
    EXPECT_FALSE(log.Matching(std::string("No respond on modem cmd ") + cmd).empty())
        << cmd << " was never logged, so its secret was never at risk\n" << log.Dump();
  }
  for (const auto& l : lines) {
    for (const auto& s : kSecrets) {
      EXPECT_EQ(l.message.find(s), std::string::npos) << "secret " << s << " in: " << l.message;
    }
  }
  // Files that hold the PIN-protected SIM's profile password and the dialler's chat.
  ASSERT_TRUE(vorntest::Exists(kProfile));
  EXPECT_EQ(vorntest::FileMode(kProfile), 0600);
  if (vorntest::Exists(kWvdialLog)) {
    EXPECT_EQ(vorntest::FileMode(kWvdialLog), 0600);
  }
}
