// The supplicant configuration of each EAP type (golden files, parsed by the real wpa_supplicant
// on the sandbox's veth eth0), the settings file, the client job's start path through a
// recording /sbin/initctl, and the status read from a recorded wpa_cli.
#include <gtest/gtest.h>
#include <json/json.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <map>
#include <string>
#include <vector>

#include "fixtures/fake_journal.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "vornplatform/crypt.h"
#include "vornwireless/authentication/8021x.h"

namespace auth = vornnetwork::authentication;
using vorntest::LogLine;
using vorntest::SyslogCapture;
using vornwireless::utils::ConfigNoSection;

namespace {

const std::string kDir = "/usr/vorn/etc/8021X/";
const std::string kConf = "/usr/vorn/etc/wpa_supplicant.conf.eth0";
const std::string kCfg = "/usr/vorn/etc/8021X/cfg-eth0";
const char kSrc[] = "authentication/8021x.cpp";

std::string Golden(const std::string& name) {
  std::string text =
      vorntest::ReadFile(vorntest::SourceDir() + "/tests/unit/authentication/golden/" + name);
  EXPECT_FALSE(text.empty()) << "missing golden file " << name;
  return text;
}

std::string Encrypt(const std::string& clear) {
  char out[1024] = {0};
  EXPECT_NE(VLIBCCryptSzEncrypt(clear.c_str(), out, sizeof out), 0);
  return out;
}

ConfigNoSection MakeCfg(const std::map<std::string, std::string>& keys,
                        const std::string& clearPassword = "") {
  ConfigNoSection cfg;
  for (const auto& kv : keys) cfg.AddKeyValue(kv.first, kv.second);
  if (!clearPassword.empty()) cfg.AddKeyValue("password", Encrypt(clearPassword));
  return cfg;
}

void Reset() {
  vorntest::Run({"/bin/rm", "-rf", kDir, kConf, "/usr/vorn/etc/wpa_supplicant.conf.eth1"});
  vorntest::ClearFakeJournal();
  vorntest::WriteFakeReplies(Json::Value(Json::objectValue));
}

void Touch(const std::string& path) {
  vorntest::Run({"/bin/mkdir", "-p", kDir});
  ASSERT_TRUE(vorntest::WriteFile(path, "placeholder\n"));
}

// Starts the real wpa_supplicant with the wired driver on eth0 and the file; true when it read
// the file and runs. The network's values are then read back through the real wpa_cli.
class Supplicant {
 public:
  explicit Supplicant(const std::string& conf) {
    vorntest::Run({"/bin/mkdir", "-p", "/var/run/wpa_supplicant"});
    unlink(kPid);
    result_ = vorntest::Run(
        {"/usr/sbin/wpa_supplicant", "-B", "-D", "wired", "-i", "eth0", "-c", conf, "-P", kPid}, "",
        30);
  }
  ~Supplicant() {
    pid_t pid = VLIBCReadPidFileForTest();
    if (pid > 0) {
      kill(pid, SIGTERM);
      for (int i = 0; i < 100 && kill(pid, 0) == 0; ++i) usleep(20000);
    }
    unlink(kPid);
  }
  bool Started() const { return result_.status == 0; }
  std::string Output() const { return result_.out + result_.err; }
  std::string Get(const std::string& field) const {
    auto r = vorntest::Run({"/usr/sbin/wpa_cli", "-i", "eth0", "get_network", "0", field}, "", 20);
    return r.out;
  }

 private:
  static constexpr const char* kPid = "/run/auth-test-wpa.pid";
  static pid_t VLIBCReadPidFileForTest() {
    std::string text = vorntest::ReadFile(kPid);
    return text.empty() ? 0 : static_cast<pid_t>(std::stol(text));
  }
  vorntest::RunResult result_;
};

class WpaConfTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    Reset();
  }
};

// ---------------------------------------------------------------------------------------------
// Generated files, byte for byte, and the real supplicant reading them

TEST_F(WpaConfTest, PeapMschapv2WithCaAndAnonymousIdentityMatchesGoldenAndParses) {
  Touch(kDir + "eth0_ca.crt");
  auto cfg = MakeCfg({{"eap", "peap"},
                      {"phase2", "mschapv2"},
                      {"identity", "alice"},
                      {"anonymous_identity", "anon"}},
                     "s3cret pass");
  ASSERT_EQ(auth::WriteWpaConf("eth0", cfg), 0);
  EXPECT_EQ(vorntest::ReadFile(kConf), Golden("peap-mschapv2.conf"));
  EXPECT_EQ(vorntest::FileMode(kConf), 0600);
  Supplicant s(kConf);
  ASSERT_TRUE(s.Started()) << s.Output();
  EXPECT_EQ(s.Get("eap"), "PEAP");
  EXPECT_EQ(s.Get("identity"), "\"alice\"");
  EXPECT_EQ(s.Get("phase2"), "\"auth=MSCHAPV2\"");
  EXPECT_EQ(s.Get("ca_cert"), "\"/usr/vorn/etc/8021X/eth0_ca.crt\"");
  EXPECT_EQ(s.Get("anonymous_identity"), "\"anon\"");
}

TEST_F(WpaConfTest, TtlsGtcWithoutCaMatchesGoldenAndParses) {
  auto cfg = MakeCfg({{"eap", "ttls"}, {"phase2", "gtc"}, {"identity", "bob"}}, "pw");
  ASSERT_EQ(auth::WriteWpaConf("eth0", cfg), 0);
  EXPECT_EQ(vorntest::ReadFile(kConf), Golden("ttls-gtc.conf"));
  Supplicant s(kConf);
  ASSERT_TRUE(s.Started()) << s.Output();
  EXPECT_EQ(s.Get("eap"), "TTLS");
  EXPECT_EQ(s.Get("phase1"), "\"peaplabel=1\"");
  EXPECT_EQ(s.Get("phase2"), "\"auth=GTC\"");
}

TEST_F(WpaConfTest, TlsWithAllFilesMatchesGoldenAndParses) {
  Touch(kDir + "eth0_ca.crt");
  Touch(kDir + "eth0_user.crt");
  Touch(kDir + "eth0.key");
  // A TLS configuration has no password: none stored is not a failure.
  auto cfg = MakeCfg({{"eap", "tls"}, {"identity", "user"}, {"key_password", "kp"}});
  ASSERT_EQ(auth::WriteWpaConf("eth0", cfg), 0);
  EXPECT_EQ(vorntest::ReadFile(kConf), Golden("tls.conf"));
  Supplicant s(kConf);
  ASSERT_TRUE(s.Started()) << s.Output();
  EXPECT_EQ(s.Get("eap"), "TLS");
  EXPECT_EQ(s.Get("client_cert"), "\"/usr/vorn/etc/8021X/eth0_user.crt\"");
  EXPECT_EQ(s.Get("private_key"), "\"/usr/vorn/etc/8021X/eth0.key\"");
  EXPECT_EQ(s.Get("fragment_size"), "1300");
}

TEST_F(WpaConfTest, TlsWithoutFilesWritesOnlyTheKeyPasswordLineAndParses) {
  auto cfg = MakeCfg({{"eap", "tls"}, {"identity", "user"}, {"anonymous_identity", "anon"}});
  ASSERT_EQ(auth::WriteWpaConf("eth0", cfg), 0);
  EXPECT_EQ(vorntest::ReadFile(kConf), Golden("tls-nofiles.conf"));
  Supplicant s(kConf);
  ASSERT_TRUE(s.Started()) << s.Output();
}

TEST_F(WpaConfTest, FastMatchesGoldenAndParses) {
  auto cfg = MakeCfg({{"eap", "fast"}, {"identity", "carol"}}, "pw2");
  ASSERT_EQ(auth::WriteWpaConf("eth0", cfg), 0);
  EXPECT_EQ(vorntest::ReadFile(kConf), Golden("fast.conf"));
  Supplicant s(kConf);
  ASSERT_TRUE(s.Started()) << s.Output();
  EXPECT_EQ(s.Get("eap"), "FAST");
  EXPECT_EQ(s.Get("pac_file"), "\"blob://eap-fast-pac\"");
}

TEST_F(WpaConfTest, AutoWritesNoPhase1AndNoCertificateLinesEvenWithStoredFiles) {
  Touch(kDir + "eth0_ca.crt");
  Touch(kDir + "eth0_user.crt");
  Touch(kDir + "eth0.key");
  auto cfg = MakeCfg({{"eap", "auto"}, {"phase2", "mschapv2"}, {"identity", "dave"}}, "pw3");
  ASSERT_EQ(auth::WriteWpaConf("eth0", cfg), 0);
  std::string text = vorntest::ReadFile(kConf);
  EXPECT_EQ(text, Golden("auto.conf"));
  EXPECT_EQ(text.find("phase1="), std::string::npos);
  EXPECT_EQ(text.find("_cert="), std::string::npos);
  EXPECT_EQ(text.find("private_key"), std::string::npos);
  Supplicant s(kConf);
  ASSERT_TRUE(s.Started()) << s.Output();
  EXPECT_EQ(s.Get("eap"), "TTLS PEAP");
}

TEST_F(WpaConfTest, TheSupplicantCheckFailsOnABrokenFile) {
  // The parse check above can fail: a line the supplicant does not know stops it.
  ASSERT_TRUE(vorntest::WriteFile(kConf, Golden("auto.conf") + "bogus_line=1\n"));
  Supplicant s(kConf);
  EXPECT_FALSE(s.Started());
}

TEST_F(WpaConfTest, AnExistingFileIsReplacedWhole) {
  ASSERT_TRUE(vorntest::WriteFile(kConf, std::string(5000, 'x')));
  auto cfg = MakeCfg({{"eap", "ttls"}, {"phase2", "gtc"}, {"identity", "bob"}}, "pw");
  ASSERT_EQ(auth::WriteWpaConf("eth0", cfg), 0);
  EXPECT_EQ(vorntest::ReadFile(kConf), Golden("ttls-gtc.conf"));
}

// ---------------------------------------------------------------------------------------------
// Refused configurations

TEST_F(WpaConfTest, UnknownEapTypeIsLoggedAndWritesNothing) {
  for (const char* eap : {"md5", "", "PEAP", "leap"}) {
    SyslogCapture log;
    auto cfg = MakeCfg({{"eap", eap}, {"identity", "x"}}, "pw");
    EXPECT_EQ(auth::WriteWpaConf("eth0", cfg), -1) << eap;
    EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSrc, std::string("Unknown EAP-Type [") + eap + "]")))
        << log.Dump();
    EXPECT_FALSE(vorntest::Exists(kConf));
  }
}

TEST_F(WpaConfTest, PapMschapAndUnknownPhase2FailForTunnelledTypes) {
  for (const char* eap : {"ttls", "peap"}) {
    for (const char* phase2 : {"pap", "mschap", "chap", ""}) {
      SyslogCapture log;
      auto cfg = MakeCfg({{"eap", eap}, {"phase2", phase2}, {"identity", "x"}}, "pw");
      EXPECT_EQ(auth::WriteWpaConf("eth0", cfg), -1) << eap << "/" << phase2;
      EXPECT_TRUE(
          log.HasOnce(LOG_ERR, LogLine(kSrc, std::string("Unknown PHASE2-Type [") + phase2 + "]")))
          << log.Dump();
      EXPECT_FALSE(vorntest::Exists(kConf));
    }
  }
}

TEST_F(WpaConfTest, QuotesAndLineBreaksInValuesAreRefusedWithoutLoggingThem) {
  const std::vector<std::pair<std::string, std::string>> cases = {
      {"identity", "al\"ice"},        {"identity", "alice\n\tpassword=\"x\""},
      {"anonymous_identity", "a\rb"}, {"key_password", "k\"p"},
      {"password", "se\"cret"},       {"password", "secret\nnetwork={"},
  };
  for (const auto& c : cases) {
    SyslogCapture log;
    ConfigNoSection cfg = MakeCfg({{"eap", "peap"}, {"phase2", "mschapv2"}, {"identity", "x"}});
    if (c.first == "password") {
      cfg.AddKeyValue("password", Encrypt(c.second));
    } else {
      cfg.AddKeyValue(c.first, c.second);
    }
    EXPECT_EQ(auth::WriteWpaConf("eth0", cfg), -1) << c.first;
    EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSrc, "Quote or line break in [" + c.first + "]")))
        << log.Dump();
    EXPECT_FALSE(vorntest::Exists(kConf));
    EXPECT_EQ(log.Dump().find(c.second), std::string::npos);
  }
}

TEST_F(WpaConfTest, APasswordThatDoesNotDecryptFails) {
  SyslogCapture log;
  auto cfg = MakeCfg({{"eap", "peap"},
                      {"phase2", "mschapv2"},
                      {"identity", "x"},
                      {"password", "plain-not-enciphered"}});
  EXPECT_EQ(auth::WriteWpaConf("eth0", cfg), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSrc, "Failed to decrypt password"))) << log.Dump();
  EXPECT_FALSE(vorntest::Exists(kConf));
}

TEST_F(WpaConfTest, InterfaceNamesWithSlashOrDotsAreRefused) {
  for (const char* name :
       {"../eth0", "a/b", "..", ".", "", "eth0 x", "eth0:1", "abcdefghijklmnop"}) {
    auto cfg = MakeCfg({{"eap", "auto"}, {"identity", "x"}}, "pw");
    EXPECT_EQ(auth::WriteWpaConf(name, cfg), -1) << name;
    EXPECT_EQ(auth::Auth8021XSetConf(name, cfg, false), -1) << name;
  }
  EXPECT_FALSE(vorntest::Exists("/usr/vorn/etc/eth0"));
  EXPECT_FALSE(vorntest::Exists(kDir));
}

// ---------------------------------------------------------------------------------------------
// Settings and the client job

class SetConfTest : public WpaConfTest {
 protected:
  void SetUp() override {
    WpaConfTest::SetUp();
    ASSERT_TRUE(vorntest::InstallFake("/sbin/initctl"));
  }
  std::vector<std::vector<std::string>> Initctl() {
    std::vector<std::vector<std::string>> calls;
    for (const auto& c : vorntest::FakeCallsTo("/sbin/initctl")) calls.push_back(c.argv);
    return calls;
  }
};

using Argv = std::vector<std::string>;

TEST_F(SetConfTest, EnabledConfigurationIsWrittenThenTheJobRestartedAndTheSettingsStored) {
  auto cfg = MakeCfg({{"enable", "yes"},
                      {"eap", "peap"},
                      {"phase2", "mschapv2"},
                      {"identity", "alice"},
                      {"anonymous_identity", "anon"}},
                     "s3cret pass");
  Touch(kDir + "eth0_ca.crt");
  ASSERT_EQ(auth::Auth8021XSetConf("eth0", cfg, false), 0);
  EXPECT_EQ(vorntest::ReadFile(kConf), Golden("peap-mschapv2.conf"));
  EXPECT_EQ(Initctl(), (std::vector<Argv>{{"stop", "8021x-client", "IFACE=eth0"},
                                          {"start", "8021x-client", "IFACE=eth0", "TEST=false"}}));
  ConfigNoSection stored;
  ASSERT_EQ(auth::Auth8021XGetConf("eth0", stored), 0);
  EXPECT_EQ(stored.GetKeyValues(), cfg.GetKeyValues());
  EXPECT_EQ(vorntest::FileMode(kCfg), 0600);
}

TEST_F(SetConfTest, ATestRunStartsTheJobWithTestTrueAndLeavesTheSettingsByteIdentical) {
  auto old =
      MakeCfg({{"enable", "yes"}, {"eap", "ttls"}, {"phase2", "gtc"}, {"identity", "bob"}}, "pw");
  ASSERT_EQ(auth::Auth8021XSetConf("eth0", old, false), 0);
  std::string before = vorntest::ReadFile(kCfg);
  ASSERT_FALSE(before.empty());
  vorntest::ClearFakeJournal();

  auto trial = MakeCfg({{"enable", "yes"}, {"eap", "auto"}, {"identity", "dave"}}, "pw3");
  ASSERT_EQ(auth::Auth8021XSetConf("eth0", trial, true), 0);
  EXPECT_EQ(vorntest::ReadFile(kCfg), before);
  EXPECT_EQ(vorntest::ReadFile(kConf), Golden("auto.conf"));
  EXPECT_EQ(Initctl(), (std::vector<Argv>{{"stop", "8021x-client", "IFACE=eth0"},
                                          {"start", "8021x-client", "IFACE=eth0", "TEST=true"}}));

  // A disabling test run stops the job and leaves the settings alone as well.
  vorntest::ClearFakeJournal();
  auto off = MakeCfg({{"enable", "no"}});
  ASSERT_EQ(auth::Auth8021XSetConf("eth0", off, true), 0);
  EXPECT_EQ(vorntest::ReadFile(kCfg), before);
  EXPECT_EQ(Initctl(), (std::vector<Argv>{{"stop", "8021x-client", "IFACE=eth0"}}));
}

TEST_F(SetConfTest, PapWithTtlsFailsBeforeAnyDaemonAction) {
  SyslogCapture log;
  auto cfg =
      MakeCfg({{"enable", "yes"}, {"eap", "ttls"}, {"phase2", "pap"}, {"identity", "x"}}, "pw");
  EXPECT_EQ(auth::Auth8021XSetConf("eth0", cfg, false), -1);
  EXPECT_TRUE(Initctl().empty());
  EXPECT_FALSE(vorntest::Exists(kConf));
  EXPECT_FALSE(vorntest::Exists(kCfg));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSrc, "Unknown PHASE2-Type [pap]"))) << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSrc, "Failed to Write wpa_supplicant config file")));
}

TEST_F(SetConfTest, DisablingStopsTheJobAndRemovesTheGeneratedFile) {
  ASSERT_TRUE(vorntest::WriteFile(kConf, "old\n"));
  auto cfg = MakeCfg({{"enable", "no"}, {"eap", "tls"}});
  ASSERT_EQ(auth::Auth8021XSetConf("eth0", cfg, false), 0);
  EXPECT_FALSE(vorntest::Exists(kConf));
  EXPECT_EQ(Initctl(), (std::vector<Argv>{{"stop", "8021x-client", "IFACE=eth0"}}));
  EXPECT_EQ(vorntest::ReadFile(kCfg), "eap=tls\nenable=no\n");
}

TEST_F(SetConfTest, AStopRefusedByTheJobIsNotAFailure) {
  // Upstart's "Unknown instance" (exit 1) when nothing runs: the sign of 1 is no failure.
  Json::Value entry;
  entry["args_prefix"].append("stop");
  entry["exit"] = 1;
  ASSERT_TRUE(vorntest::AddFakeReply("/sbin/initctl", entry));
  auto cfg = MakeCfg({{"enable", "yes"}, {"eap", "auto"}, {"identity", "dave"}}, "pw3");
  EXPECT_EQ(auth::Auth8021XStopDaemon("eth0", false), 1);
  EXPECT_EQ(auth::Auth8021XSetConf("eth0", cfg, false), 0);
  EXPECT_EQ(Initctl().size(), 3u);
}

TEST_F(SetConfTest, AJobThatCannotRunFailsTheStart) {
  unlink("/sbin/initctl");
  SyslogCapture log;
  auto cfg = MakeCfg({{"enable", "yes"}, {"eap", "auto"}, {"identity", "dave"}}, "pw3");
  EXPECT_EQ(auth::Auth8021XStartDaemon("eth0", false), -1);
  EXPECT_EQ(auth::Auth8021XSetConf("eth0", cfg, false), -1);
  EXPECT_TRUE(log.HasOnce(LOG_INFO, LogLine(kSrc, "failed to stop 8021x daemon"))) << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSrc, "Failed to Start wpa_supplicant")));
  EXPECT_FALSE(vorntest::Exists(kCfg));

  log.Clear();
  auto off = MakeCfg({{"enable", "no"}});
  EXPECT_EQ(auth::Auth8021XSetConf("eth0", off, false), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSrc, "Failed to Start wpa_supplicant")));
}

TEST_F(SetConfTest, SettingsThatWouldBreakTheKeyFileAreNotWritten) {
  SyslogCapture log;
  auto cfg = MakeCfg({{"enable", "no"}, {"identity", "x\nenable=yes"}});
  EXPECT_EQ(auth::Auth8021XSetConf("eth0", cfg, false), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSrc, "Failed to write config file"))) << log.Dump();
  EXPECT_FALSE(vorntest::Exists(kCfg));
}

TEST_F(SetConfTest, GetConfWithoutAFileGivesEnableNo) {
  SyslogCapture log;
  ConfigNoSection cfg;
  ASSERT_EQ(auth::Auth8021XGetConf("eth0", cfg), 0);
  EXPECT_EQ(cfg.GetNameString(), kCfg);
  EXPECT_EQ(cfg.GetKeyValue("enable"), "no");
  EXPECT_TRUE(log.HasOnce(LOG_INFO, LogLine(kSrc, "No 802.1X config"))) << log.Dump();
}

TEST_F(SetConfTest, GetConfOfAnUnreadableFileFails) {
  vorntest::Run({"/bin/mkdir", "-p", kCfg});  // a directory where the file should be
  SyslogCapture log;
  ConfigNoSection cfg;
  EXPECT_EQ(auth::Auth8021XGetConf("eth0", cfg), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSrc, "Failed to read 802.1X config"))) << log.Dump();
}

// ---------------------------------------------------------------------------------------------
// Names

TEST(AuthEnumMap, NamesAndNumbers) {
  auth::AUTH_EAP eap = auth::AUTH_EAP_TLS;
  EXPECT_TRUE(auth::AuthEnumMap<auth::AUTH_EAP>::StringToEnum("auto", eap));
  EXPECT_EQ(eap, 0);
  EXPECT_TRUE(auth::AuthEnumMap<auth::AUTH_EAP>::StringToEnum("fast", eap));
  EXPECT_EQ(eap, 4);
  EXPECT_FALSE(auth::AuthEnumMap<auth::AUTH_EAP>::StringToEnum("FAST", eap));
  EXPECT_EQ(eap, 4);
  EXPECT_EQ(auth::AuthEnumMap<auth::AUTH_EAP>::EnumToString(auth::AUTH_EAP_PEAP), "peap");
  auth::AUTH_PHASE2 p2 = auth::AUTH_PHASE2_PAP;
  EXPECT_TRUE(auth::AuthEnumMap<auth::AUTH_PHASE2>::StringToEnum("mschapv2", p2));
  EXPECT_EQ(p2, 3);
  EXPECT_TRUE(auth::AuthEnumMap<auth::AUTH_PHASE2>::StringToEnum("gtc", p2));
  EXPECT_EQ(p2, 1);
  EXPECT_FALSE(auth::AuthEnumMap<auth::AUTH_PHASE2>::StringToEnum("chap", p2));
}

}  // namespace
