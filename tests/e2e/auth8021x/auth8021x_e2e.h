// Shared set-up of the 802.1X scenarios: keys and certificates made with the real openssl, the
// real hostapd as wired authenticator on the peer end of veth eth0, and the initctl shim.
#ifndef VORN_TESTS_E2E_AUTH8021X_E2E_H
#define VORN_TESTS_E2E_AUTH8021X_E2E_H

#include <gtest/gtest.h>
#include <sys/types.h>

#include <string>
#include <vector>

namespace authe2e {

// Files under the fixture directory: ca.crt, user.crt, user.key (the authenticator knows "user"
// for TLS and "alice" with password "s3cret pass" for PEAP/MSCHAPv2).
std::string F(const std::string& name);

class Authenticator : public ::testing::Environment {
 public:
  void SetUp() override;
  void TearDown() override;
};

// Starts hostapd on the peer host anew (stopping the running one).
void RestartAuthenticator();
std::string EncryptPassword(const std::string& clear);
// Reads the status up to `tries` times (each reading waits one second) until it is `wanted`;
// the last status read. Every reading is appended to seen when given.
std::string WaitForStatus(const std::string& wanted, int tries, std::vector<std::string>* seen);
// The supplicant the job runs on eth0, 0 when none.
pid_t SupplicantPid();
std::string Cmdline(pid_t pid);

}  // namespace authe2e

#endif
