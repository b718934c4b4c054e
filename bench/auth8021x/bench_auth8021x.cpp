// One key upload (header check, BOM strips, two modulus readings and two digests by the real
// openssl) and the time from Auth8021XSetConf to the supplicant's EAP state SUCCESS, against the
// real hostapd on the peer end of veth eth0. Prints figures; asserts nothing.
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <sstream>
#include <string>
#include <vector>

#include "vornplatform/crypt.h"
#include "vornplatform/proc.h"
#include "vornwireless/authentication/8021x.h"

namespace auth = vornnetwork::authentication;
using vornwireless::utils::ConfigNoSection;
using Clock = std::chrono::steady_clock;

namespace {

const std::string kDir = "/run/bench-auth8021x";

std::string F(const std::string& name) { return kDir + "/" + name; }

// Runs argv quietly; its exit status.
int Sh(const std::string& command) { return std::system((command + " >/dev/null 2>&1").c_str()); }

std::string Read(const std::string& path) {
  std::ifstream in(path);
  std::stringstream s;
  s << in.rdbuf();
  return s.str();
}

double Ms(Clock::time_point a, Clock::time_point b) {
  return std::chrono::duration<double, std::milli>(b - a).count();
}

void Print(const char* what, std::vector<double> v) {
  std::sort(v.begin(), v.end());
  printf("%-44s n=%zu  min %7.1f ms  median %7.1f ms  max %7.1f ms\n", what, v.size(), v.front(),
         v[v.size() / 2], v.back());
}

bool Setup() {
  std::string peer = getenv("VORN_PEER_ETH0_PID") ? getenv("VORN_PEER_ETH0_PID") : "";
  const char* src = getenv("VORN_SOURCE_DIR");
  if (peer.empty() || !src) {
    fprintf(stderr, "run inside the sandbox with --veth eth0 (bench/auth8021x/run)\n");
    return false;
  }
  std::string o = "/usr/bin/openssl ";
  bool ok = Sh("mkdir -p " + kDir) == 0 &&
            Sh(o + "req -x509 -newkey rsa:2048 -nodes -keyout " + F("ca.key") + " -out " +
               F("ca.crt") + " -days 2 -subj /CN=CA") == 0;
  for (const char* n : {"server", "user"}) {
    std::string b = F(n);
    ok = ok && Sh(o + "genrsa -traditional -out " + b + ".key 2048") == 0 &&
         Sh(o + "req -new -key " + b + ".key -out " + b + ".csr -subj /CN=" + n) == 0 &&
         Sh(o + "x509 -req -in " + b + ".csr -CA " + F("ca.crt") + " -CAkey " + F("ca.key") +
            " -CAcreateserial -out " + b + ".crt -days 2") == 0;
  }
  std::ofstream(F("eap_users")) << "\"user\" TLS\n\"alice\" PEAP\n"
                                   "\"alice\" MSCHAPV2 \"s3cret pass\" [2]\n";
  std::ofstream(F("hostapd.conf"))
      << "interface=eth0\ndriver=wired\nieee8021x=1\n"
         "eapol_version=2\neap_server=1\neap_user_file="
      << F("eap_users") << "\nca_cert=" << F("ca.crt") << "\nserver_cert=" << F("server.crt")
      << "\nprivate_key=" << F("server.key") << "\n";
  ok = ok && Sh("nsenter -t " + peer + " -n /usr/sbin/hostapd -B -P " + F("hostapd.pid") + " " +
                F("hostapd.conf")) == 0;
  ok = ok && Sh(std::string("cp ") + src + "/dist/debian/initctl /usr/sbin/initctl") == 0;
  return ok;
}

// Polls the supplicant's status every 10 ms until its EAP state is SUCCESS (30 s at most).
bool WaitSuccess() {
  for (int i = 0; i < 3000; ++i) {
    FILE* fp = VLIBCPopen("/usr/sbin/wpa_cli", "r", "-i", "eth0", "status",
                          static_cast<const char*>(nullptr));
    char line[1024];
    bool success = false;
    while (fp && fgets(line, sizeof line, fp))
      success = success || strcmp(line, "EAP state=SUCCESS\n") == 0;
    if (fp) VLIBCPclose(fp);
    if (success) return true;
    usleep(10000);
  }
  return false;
}

void Disable() {
  ConfigNoSection off;
  off.AddKeyValue("enable", "no");
  auth::Auth8021XSetConf("eth0", off, false);
}

}  // namespace

int main(int argc, char** argv) {
  int rounds = 10;
  for (int i = 1; i + 1 < argc; ++i) {
    if (strcmp(argv[i], "--rounds") == 0) rounds = std::max(1, atoi(argv[i + 1]));
  }
  if (!Setup()) {
    fprintf(stderr, "set-up failed\n");
    return 1;
  }
  if (auth::Auth8021XUploadCert("eth0", auth::AUTH_FILE_CA_CERT, F("ca.crt")) != 0 ||
      auth::Auth8021XUploadCert("eth0", auth::AUTH_FILE_USER_CERT, F("user.crt")) != 0) {
    fprintf(stderr, "certificate upload failed\n");
    return 1;
  }
  std::vector<double> upload;
  for (int i = 0; i < rounds; ++i) {
    auto t0 = Clock::now();
    int rc = auth::Auth8021XUploadCert("eth0", auth::AUTH_FILE_KEY, F("user.key"));
    upload.push_back(Ms(t0, Clock::now()));
    if (rc != 0) {
      fprintf(stderr, "key upload gave %d\n", rc);
      return 1;
    }
  }
  Print("key upload (all openssl checks)", upload);

  char cipher[1024] = {0};
  VLIBCCryptSzEncrypt("s3cret pass", cipher, sizeof cipher);
  struct Case {
    const char* name;
    std::vector<std::pair<std::string, std::string>> keys;
  } cases[] = {
      {"EAP-TLS", {{"eap", "tls"}, {"identity", "user"}}},
      {"PEAP/MSCHAPv2",
       {{"eap", "peap"}, {"phase2", "mschapv2"}, {"identity", "alice"}, {"password", cipher}}},
  };
  for (const auto& c : cases) {
    std::vector<double> set, success;
    for (int i = 0; i < rounds; ++i) {
      Disable();
      ConfigNoSection cfg;
      auth::Auth8021XGetConf("eth0", cfg);
      cfg.AddKeyValue("enable", "yes");
      for (const auto& kv : c.keys) cfg.AddKeyValue(kv.first, kv.second);
      auto t0 = Clock::now();
      if (auth::Auth8021XSetConf("eth0", cfg, false) != 0) {
        fprintf(stderr, "%s: SetConf failed\n", c.name);
        return 1;
      }
      set.push_back(Ms(t0, Clock::now()));
      if (!WaitSuccess()) {
        fprintf(stderr, "%s: no EAP success within 30 s\n", c.name);
        return 1;
      }
      success.push_back(Ms(t0, Clock::now()));
    }
    Print((std::string(c.name) + ": SetConf returns").c_str(), set);
    Print((std::string(c.name) + ": SetConf to EAP state SUCCESS").c_str(), success);
  }
  // The status function itself waits one second before asking wpa_cli.
  std::string status;
  auto t0 = Clock::now();
  auth::Auth8021XGetStatus("eth0", status);
  printf("%-44s %s after %.1f ms\n", "Auth8021XGetStatus", status.c_str(), Ms(t0, Clock::now()));
  Disable();
  std::string pid = Read(F("hostapd.pid"));
  if (!pid.empty()) kill(atoi(pid.c_str()), SIGTERM);
  return 0;
}
