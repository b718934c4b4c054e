// The status of the 802.1X client as wpa_cli reports it (a recorded wpa_cli, and the real one
// without a supplicant). Runs under the time seam: each reading waits one second first.
#include <gtest/gtest.h>
#include <json/json.h>
#include <unistd.h>

#include <string>
#include <utility>
#include <vector>

#include "fixtures/fake_journal.h"
#include "support/test_util.h"
#include "vornwireless/authentication/8021x.h"

namespace auth = vornnetwork::authentication;

namespace {

using Argv = std::vector<std::string>;

class StatusTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    vorntest::ClearFakeJournal();
  }
};

TEST_F(StatusTest, EapStateWordsMapToTheStatusTexts) {
  ASSERT_TRUE(vorntest::InstallFake("/usr/sbin/wpa_cli"));
  const std::vector<std::pair<std::string, std::string>> cases = {
      {"EAP state=SUCCESS\n", "authenticated"},
      {"EAP state=SUCCESSFUL\n", "authenticated"},  // only the first 7 characters count
      {"EAP state=FAILURE\n", "unauthenticated"},
      {"EAP state=IDLE\n", "authenticating"},
      {"EAP state=IDLEX\n", "authenticating"},  // only the first 4
      {"EAP state=METHOD\n", "unknown"},
      {"EAP state=SUCCES\n", "unknown"},
      {"wpa_state=COMPLETED\nSupplicant PAE state=AUTHENTICATED\n", "unknown"},
      {"", "unknown"},
      {"bssid=x\nEAP state=FAILURE\nEAP state=SUCCESS\n", "unauthenticated"},  // the first line
  };
  for (const auto& c : cases) {
    Json::Value replies;
    Json::Value entry;
    entry["args"].append("-i");
    entry["args"].append("eth0");
    entry["args"].append("status");
    entry["stdout"] = "wpa_state=COMPLETED\n" + c.first;
    replies["/usr/sbin/wpa_cli"].append(entry);
    ASSERT_TRUE(vorntest::WriteFakeReplies(replies));
    std::string status = "junk";
    EXPECT_EQ(auth::Auth8021XGetStatus("eth0", status), 0);
    EXPECT_EQ(status, c.second) << c.first;
  }
  auto calls = vorntest::FakeCallsTo("/usr/sbin/wpa_cli");
  ASSERT_EQ(calls.size(), cases.size());
  EXPECT_EQ(calls[0].argv, (Argv{"-i", "eth0", "status"}));
}

TEST_F(StatusTest, WithoutWpaCliTheStatusIsUnknown) {
  unlink("/usr/sbin/wpa_cli");
  std::string status;
  EXPECT_EQ(auth::Auth8021XGetStatus("eth0", status), 0);
  EXPECT_EQ(status, "unknown");
}

TEST_F(StatusTest, TheRealWpaCliWithoutASupplicantGivesUnknown) {
  std::string status;
  EXPECT_EQ(auth::Auth8021XGetStatus("eth0", status), 0);
  EXPECT_EQ(status, "unknown");
}

}  // namespace
