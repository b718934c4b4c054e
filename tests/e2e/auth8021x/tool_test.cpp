// vornnetdtool's 802.1X commands: JSON in and out, against the same real authenticator.
#include <gtest/gtest.h>
#include <json/json.h>

#include <string>
#include <vector>

#include "auth8021x_e2e.h"
#include "support/test_util.h"

#pragma GCC diagnostic ignored "-Wdeprecated-declarations"

namespace {

using authe2e::F;

vorntest::RunResult Tool(const std::string& sub, const std::string& json) {
  return vorntest::Run({VORNNETDTOOL, "8021x", sub, json}, "", 60);
}

Json::Value Answer(const vorntest::RunResult& r) {
  Json::Value value;
  Json::Reader reader;
  EXPECT_TRUE(reader.parse(r.out, value)) << r.out << r.err;
  return value;
}

class ToolTest : public ::testing::Test {
 protected:
  void SetUp() override {
    authe2e::RestartAuthenticator();
    Tool("set-conf", R"({"ifname": "eth0", "conf": {"enable": "no"}})");
    vorntest::Run({"/bin/rm", "-rf", "/usr/vorn/etc/8021X"});
  }
  void TearDown() override {
    auto r = Tool("set-conf", R"({"ifname": "eth0", "conf": {"enable": false}})");
    EXPECT_EQ(r.status, 0) << r.out << r.err;
  }
};

TEST_F(ToolTest, UploadSetConfAndStatusReachAuthenticated) {
  auto r = Tool("upload", R"({"ifname": "eth0", "type": "ca", "path": ")" + F("ca.crt") + "\"}");
  EXPECT_EQ(r.status, 0) << r.err;
  EXPECT_EQ(r.out, "{\"result\":0}\n");
  r = Tool("set-conf", R"({"ifname": "eth0", "test": false, "conf": {"enable": "yes",
           "eap": "peap", "phase2": "mschapv2", "identity": "alice",
           "password": "s3cret pass"}})");
  EXPECT_EQ(r.status, 0) << r.err;
  EXPECT_EQ(r.out, "{\"result\":0}\n");
  std::string stored = vorntest::ReadFile("/usr/vorn/etc/8021X/cfg-eth0");
  EXPECT_EQ(stored.find("s3cret"), std::string::npos);
  EXPECT_NE(stored.find("\npassword="), std::string::npos);

  std::string status;
  for (int i = 0; i < 30 && status != "authenticated"; ++i) {
    r = Tool("status", R"({"ifname": "eth0"})");
    EXPECT_EQ(r.status, 0) << r.err;
    Json::Value answer = Answer(r);
    EXPECT_EQ(answer["result"].asInt(), 0);
    status = answer["status"].asString();
  }
  EXPECT_EQ(status, "authenticated");

  r = Tool("get-conf", R"({"ifname": "eth0"})");
  EXPECT_EQ(r.status, 0);
  Json::Value conf = Answer(r)["conf"];
  EXPECT_EQ(conf["eap"].asString(), "peap");
  EXPECT_EQ(conf["enable"].asString(), "yes");
  EXPECT_TRUE(conf["has_password"].asBool());
  EXPECT_FALSE(conf.isMember("password"));
  EXPECT_NE(conf["ca_cert_update_time"].asString(), "");
}

TEST_F(ToolTest, CheckCodesComeBackAsTheResult) {
  auto r = Tool("upload", R"({"ifname": "eth0", "type": 2, "path": ")" + F("user.key") + "\"}");
  EXPECT_EQ(r.status, 1);
  EXPECT_EQ(r.out, "{\"result\":-6}\n");
  r = Tool("upload", R"({"ifname": "../etc", "type": "ca", "path": ")" + F("ca.crt") + "\"}");
  EXPECT_EQ(r.out, "{\"result\":-1}\n");
  r = Tool("set-conf", R"({"ifname": "eth0", "conf": {"enable": "yes", "eap": "ttls",
           "phase2": "pap", "identity": "x"}})");
  EXPECT_EQ(r.status, 1);
  EXPECT_EQ(r.out, "{\"result\":-1}\n");
  EXPECT_FALSE(vorntest::Exists("/usr/vorn/etc/8021X/cfg-eth0"));
}

TEST_F(ToolTest, BadRequestsAreUsageErrors) {
  const std::vector<std::vector<std::string>> bad = {
      {"status", "not json"},
      {"status", R"({"ifname": 3})"},
      {"upload", R"({"ifname": "eth0", "type": "cert", "path": "/x"})"},
      {"set-conf", R"({"ifname": "eth0", "conf": {"colour": "red"}})"},
      {"set-conf", R"({"ifname": "eth0", "conf": {"identity": 7}})"},
      {"set-conf", R"({"ifname": "eth0", "conf": "yes"})"},
      {"frobnicate", R"({})"},
  };
  for (const auto& b : bad) {
    auto r = Tool(b[0], b[1]);
    EXPECT_EQ(r.status, 1) << b[0] << " " << b[1];
    EXPECT_EQ(r.out, "") << b[1];
    EXPECT_NE(r.err.find("vornnetdtool: 8021x: "), std::string::npos) << r.err;
  }
  EXPECT_FALSE(vorntest::Exists("/usr/vorn/etc/8021X/cfg-eth0"));
}

TEST_F(ToolTest, HelpShowsTheCommandsWithExamples) {
  auto r = vorntest::Run({VORNNETDTOOL, "8021x", "--help"});
  EXPECT_EQ(r.status, 0);
  EXPECT_NE(r.out.find("8021x set-conf JSON"), std::string::npos);
  EXPECT_NE(r.out.find("Examples:"), std::string::npos);
  r = vorntest::Run({VORNNETDTOOL, "--help"});
  EXPECT_NE(r.out.find("8021x SUBCOMMAND JSON"), std::string::npos);
}

}  // namespace
