// A real 802.1X authentication on veth eth0: the real hostapd is the wired authenticator with its
// internal EAP server on the peer host, and our generated configuration runs in the real
// wpa_supplicant, started through the Debian initctl shim at /sbin/initctl.
#include <gtest/gtest.h>
#include <signal.h>
#include <unistd.h>

#include <string>
#include <vector>

#include "auth8021x_e2e.h"
#include "support/test_util.h"
#include "vornplatform/crypt.h"
#include "vornwireless/authentication/8021x.h"

namespace auth = vornnetwork::authentication;
using vornwireless::utils::ConfigNoSection;

namespace authe2e {

std::string gDir;

std::string F(const std::string& name) { return gDir + "/" + name; }

static void Openssl(const std::vector<std::string>& args) {
  std::vector<std::string> argv = {"/usr/bin/openssl"};
  argv.insert(argv.end(), args.begin(), args.end());
  auto r = vorntest::Run(argv, "", 120);
  ASSERT_EQ(r.status, 0) << args[0] << ": " << r.err;
}

static void SignedCert(const std::string& name, const std::string& cn) {
  Openssl({"genrsa", "-traditional", "-out", F(name + ".key"), "2048"});
  Openssl(
      {"req", "-new", "-key", F(name + ".key"), "-out", F(name + ".csr"), "-subj", "/CN=" + cn});
  Openssl({"x509", "-req", "-in", F(name + ".csr"), "-CA", F("ca.crt"), "-CAkey", F("ca.key"),
           "-CAcreateserial", "-out", F(name + ".crt"), "-days", "2"});
}

void Authenticator::SetUp() {
  ASSERT_TRUE(vorntest::InSandbox());
  const char* peer = getenv("VORN_PEER_ETH0_PID");
  ASSERT_NE(peer, nullptr) << "needs the sandbox's --veth eth0";
  gDir = "/run/auth8021x-e2e";
  vorntest::Run({"/bin/mkdir", "-p", gDir});
  Openssl({"req", "-x509", "-newkey", "rsa:2048", "-nodes", "-keyout", F("ca.key"), "-out",
           F("ca.crt"), "-days", "2", "-subj", "/CN=Test CA"});
  SignedCert("server", "authenticator");
  SignedCert("user", "user");
  ASSERT_TRUE(vorntest::WriteFile(F("eap_users"),
                                  "\"user\" TLS\n"
                                  "\"alice\" PEAP\n"
                                  "\"anonymous\" PEAP\n"
                                  "\"alice\" MSCHAPV2 \"s3cret pass\" [2]\n"));
  ASSERT_TRUE(vorntest::WriteFile(F("hostapd.conf"),
                                  "interface=eth0\n"
                                  "driver=wired\n"
                                  "ieee8021x=1\n"
                                  "eapol_version=2\n"
                                  "eap_server=1\n"
                                  "eap_user_file=" +
                                      F("eap_users") +
                                      "\n"
                                      "ca_cert=" +
                                      F("ca.crt") +
                                      "\n"
                                      "server_cert=" +
                                      F("server.crt") +
                                      "\n"
                                      "private_key=" +
                                      F("server.key") + "\n"));
  RestartAuthenticator();
  // The job of the appliance is the Debian shim here.
  auto r = vorntest::Run(
      {"/bin/cp", vorntest::SourceDir() + "/dist/debian/initctl", "/usr/sbin/initctl"});
  ASSERT_EQ(r.status, 0) << r.err;
}

static void StopAuthenticator() {
  std::string text = vorntest::ReadFile(F("hostapd.pid"));
  if (text.empty()) return;
  pid_t pid = static_cast<pid_t>(std::stol(text));
  kill(pid, SIGTERM);
  for (int i = 0; i < 250 && kill(pid, 0) == 0; ++i) usleep(20000);
  unlink(F("hostapd.pid").c_str());
}

void RestartAuthenticator() {
  StopAuthenticator();
  auto r = vorntest::Run({"/usr/bin/nsenter", "-t", getenv("VORN_PEER_ETH0_PID"), "-n",
                          "/usr/sbin/hostapd", "-B", "-P", F("hostapd.pid"), F("hostapd.conf")},
                         "", 60);
  ASSERT_EQ(r.status, 0) << r.out << r.err;
  // hostapd -B writes its pid file after the starting process has returned.
  for (int i = 0; i < 250 && vorntest::ReadFile(F("hostapd.pid")).empty(); ++i) usleep(20000);
  ASSERT_FALSE(vorntest::ReadFile(F("hostapd.pid")).empty());
}

void Authenticator::TearDown() { StopAuthenticator(); }

std::string EncryptPassword(const std::string& clear) {
  char out[1024] = {0};
  EXPECT_NE(VLIBCCryptSzEncrypt(clear.c_str(), out, sizeof out), 0);
  return out;
}

std::string WaitForStatus(const std::string& wanted, int tries, std::vector<std::string>* seen) {
  std::string status;
  for (int i = 0; i < tries; ++i) {
    EXPECT_EQ(auth::Auth8021XGetStatus("eth0", status), 0);
    if (seen) seen->push_back(status);
    if (status == wanted) break;
  }
  return status;
}

pid_t SupplicantPid() {
  std::string text = vorntest::ReadFile("/run/8021x-client.eth0.pid");
  if (text.empty()) return 0;
  pid_t pid = static_cast<pid_t>(std::stol(text));
  return kill(pid, 0) == 0 ? pid : 0;
}

std::string Cmdline(pid_t pid) {
  std::string raw = vorntest::ReadFile("/proc/" + std::to_string(pid) + "/cmdline");
  for (auto& c : raw) {
    if (c == '\0') c = ' ';
  }
  return raw;
}

}  // namespace authe2e

namespace {

using namespace authe2e;

const auto* const kEnv = ::testing::AddGlobalTestEnvironment(new Authenticator);

class RealAuthTest : public ::testing::Test {
 protected:
  void SetUp() override {
    // A fresh authenticator: after a failure it would hold the port quiet for a minute.
    RestartAuthenticator();
    ConfigNoSection off;
    off.AddKeyValue("enable", "no");
    auth::Auth8021XSetConf("eth0", off, false);
    vorntest::Run({"/bin/rm", "-rf", "/usr/vorn/etc/8021X"});
  }
  void TearDown() override {
    ConfigNoSection off;
    off.AddKeyValue("enable", "no");
    EXPECT_EQ(auth::Auth8021XSetConf("eth0", off, false), 0);
    EXPECT_EQ(SupplicantPid(), 0);
  }
};

TEST_F(RealAuthTest, EapTlsWithUploadedCertificatesAuthenticates) {
  ASSERT_EQ(auth::Auth8021XUploadCert("eth0", auth::AUTH_FILE_CA_CERT, F("ca.crt")), 0);
  ASSERT_EQ(auth::Auth8021XUploadCert("eth0", auth::AUTH_FILE_USER_CERT, F("user.crt")), 0);
  ASSERT_EQ(auth::Auth8021XUploadCert("eth0", auth::AUTH_FILE_KEY, F("user.key")), 0);
  ConfigNoSection cfg;
  ASSERT_EQ(auth::Auth8021XGetConf("eth0", cfg), 0);
  cfg.AddKeyValue("enable", "yes");
  cfg.AddKeyValue("eap", "tls");
  cfg.AddKeyValue("identity", "user");
  ASSERT_EQ(auth::Auth8021XSetConf("eth0", cfg, false), 0);
  pid_t pid = SupplicantPid();
  ASSERT_GT(pid, 0);
  EXPECT_NE(Cmdline(pid).find("-D wired -i eth0 -c /usr/vorn/etc/wpa_supplicant.conf.eth0"),
            std::string::npos)
      << Cmdline(pid);
  EXPECT_EQ(WaitForStatus("authenticated", 30, nullptr), "authenticated");
}

TEST_F(RealAuthTest, PeapMschapv2Authenticates) {
  ASSERT_EQ(auth::Auth8021XUploadCert("eth0", auth::AUTH_FILE_CA_CERT, F("ca.crt")), 0);
  ConfigNoSection cfg;
  ASSERT_EQ(auth::Auth8021XGetConf("eth0", cfg), 0);
  cfg.AddKeyValue("enable", "yes");
  cfg.AddKeyValue("eap", "peap");
  cfg.AddKeyValue("phase2", "mschapv2");
  cfg.AddKeyValue("identity", "alice");
  cfg.AddKeyValue("anonymous_identity", "anonymous");
  cfg.AddKeyValue("password", EncryptPassword("s3cret pass"));
  ASSERT_EQ(auth::Auth8021XSetConf("eth0", cfg, false), 0);
  EXPECT_EQ(WaitForStatus("authenticated", 30, nullptr), "authenticated");
}

TEST_F(RealAuthTest, AWrongPasswordDoesNotAuthenticate) {
  ConfigNoSection cfg;
  cfg.AddKeyValue("enable", "yes");
  cfg.AddKeyValue("eap", "peap");
  cfg.AddKeyValue("phase2", "mschapv2");
  cfg.AddKeyValue("identity", "alice");
  cfg.AddKeyValue("password", EncryptPassword("wrong pass"));
  ASSERT_EQ(auth::Auth8021XSetConf("eth0", cfg, false), 0);
  ASSERT_GT(SupplicantPid(), 0);
  std::vector<std::string> seen;
  EXPECT_EQ(WaitForStatus("unauthenticated", 30, &seen), "unauthenticated");
  for (const auto& s : seen) EXPECT_NE(s, "authenticated");
}

TEST_F(RealAuthTest, ATestRunAuthenticatesWhileTheStoredSettingsStayAsTheyWere) {
  ConfigNoSection bad;
  bad.AddKeyValue("enable", "yes");
  bad.AddKeyValue("eap", "peap");
  bad.AddKeyValue("phase2", "mschapv2");
  bad.AddKeyValue("identity", "alice");
  bad.AddKeyValue("password", EncryptPassword("wrong pass"));
  ASSERT_EQ(auth::Auth8021XSetConf("eth0", bad, false), 0);
  std::string stored = vorntest::ReadFile("/usr/vorn/etc/8021X/cfg-eth0");
  ASSERT_FALSE(stored.empty());

  ConfigNoSection trial = bad;
  trial.AddKeyValue("password", EncryptPassword("s3cret pass"));
  ASSERT_EQ(auth::Auth8021XSetConf("eth0", trial, true), 0);
  EXPECT_EQ(WaitForStatus("authenticated", 30, nullptr), "authenticated");
  EXPECT_EQ(vorntest::ReadFile("/usr/vorn/etc/8021X/cfg-eth0"), stored);
}

TEST_F(RealAuthTest, StoppingTheJobEndsTheSupplicant) {
  ConfigNoSection cfg;
  cfg.AddKeyValue("enable", "yes");
  cfg.AddKeyValue("eap", "auto");
  cfg.AddKeyValue("identity", "alice");
  cfg.AddKeyValue("password", EncryptPassword("s3cret pass"));
  ASSERT_EQ(auth::Auth8021XSetConf("eth0", cfg, false), 0);
  pid_t pid = SupplicantPid();
  ASSERT_GT(pid, 0);
  // The job's supplicant holds none of its starter's files or pipes.
  auto fds = vorntest::Run(
      {"/bin/sh", "-c", "for f in /proc/" + std::to_string(pid) + "/fd/*; do readlink $f; done"});
  for (size_t at = 0, end; (end = fds.out.find('\n', at)) != std::string::npos; at = end + 1) {
    std::string target = fds.out.substr(at, end - at);
    EXPECT_TRUE(target == "/dev/null" || target.rfind("socket:", 0) == 0) << target;
  }
  EXPECT_EQ(auth::Auth8021XStopDaemon("eth0", false), 0);
  EXPECT_EQ(SupplicantPid(), 0);
  std::string status;
  EXPECT_EQ(auth::Auth8021XGetStatus("eth0", status), 0);
  EXPECT_EQ(status, "unknown");
  // Stopping what does not run: Upstart's "Unknown instance", exit 1.
  EXPECT_EQ(auth::Auth8021XStopDaemon("eth0", false), 1);
  EXPECT_EQ(auth::Auth8021XStartDaemon("eth0", false), 0);
  EXPECT_GT(SupplicantPid(), 0);
  EXPECT_EQ(auth::Auth8021XStartDaemon("eth0", false), 1);  // already running
}

}  // namespace
