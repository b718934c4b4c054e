// NetClient against the real NetServer over recording modules (vorn-test-net-service) on the
// sandbox's bus: the text each operation sends, the parsing of replies, the failures the caller
// sees, and IsServerReady's pid file gate.
#include "vornwireless/dbus_net/net_client.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <spawn.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <syslog.h>
#include <unistd.h>

#include <chrono>
#include <cstring>
#include <string>
#include <thread>
#include <vector>

#include "support/daemon_process.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"

#pragma GCC diagnostic ignored "-Wdeprecated-declarations"

extern char** environ;

namespace {

using vornnetwork::dbus::NetClient;
using vorntest::DaemonProcess;

const char kPidFile[] = "/var/run/vornnetd.pid";

Json::Value ParseJson(std::string const& text) {
  Json::Reader reader;
  Json::Value v;
  EXPECT_TRUE(reader.parse(text, v)) << text;
  return v;
}

// A pid that named a process that has ended.
pid_t DeadPid() {
  pid_t pid = fork();
  if (pid == 0) _exit(0);
  int status = 0;
  waitpid(pid, &status, 0);
  return pid;
}

class Client : public testing::Test {
 protected:
  static void SetUpTestSuite() {
    service_ = new DaemonProcess({VORN_TEST_NET_SERVICE}, "com.vornlink.net");
  }
  static void TearDownTestSuite() {
    int status = service_->Stop();
    if (status != 0) ADD_FAILURE() << "service ended with status " << status;
    delete service_;
  }
  void SetUp() override { ASSERT_TRUE(service_->ready()) << "vorn-test-net-service did not start"; }
  void TearDown() override { unlink(kPidFile); }

  // The last request the module of the route got before the query itself.
  Json::Value LastRouteRequest() {
    Json::Value request(Json::objectValue), result;
    request["type"] = "probe";
    EXPECT_EQ(0, client_.GetGatewayListData(request, result));
    return result["last"];
  }
  Json::Value LastDeviceRequest() {
    Json::Value result;
    EXPECT_EQ(0, client_.GetDeviceListData("probe", result));
    return result["last"];
  }
  static DaemonProcess* service_;
  NetClient client_;
};
DaemonProcess* Client::service_ = nullptr;

TEST_F(Client, QueriesSendTheRequestAndParseTheReply) {
  Json::Value request(Json::objectValue), result;
  request["type"] = "GTYPE_V4";
  ASSERT_EQ(0, client_.GetGatewayListData(request, result));
  EXPECT_EQ(ParseJson(R"({"method": "GET_GATEWAY_LIST_DATA", "type": "GTYPE_V4"})"),
            result["request"]);
  EXPECT_EQ(3, result["module"].asInt());

  Json::Value byIf(Json::objectValue);
  byIf["type"] = "GTYPE_V6";
  byIf["ifname"] = "eth0";
  ASSERT_EQ(0, client_.GetGatewayDataByInterface(byIf, result));
  EXPECT_EQ(ParseJson(R"({"method": "GET_GATEWAY_DATA_BY_INTERFACE", "type": "GTYPE_V6",
                          "ifname": "eth0"})"),
            result["request"]);

  ASSERT_EQ(0, client_.GetDeviceListData("wifi", result));
  EXPECT_EQ(ParseJson(R"({"method": "get", "scannertype": "wifi"})"), result["request"]);
  EXPECT_EQ(4, result["module"].asInt());
}

TEST_F(Client, OperationsWithoutReplyReachTheirModule) {
  Json::Value add(Json::objectValue);
  add["type"] = "GTYPE_V4";
  add["ifname"] = "eth0";
  add["priority"] = 2;
  ASSERT_EQ(0, client_.AddGatewayData(add));
  EXPECT_EQ(ParseJson(R"({"method": "ADD_GATEWAY_DATA", "type": "GTYPE_V4", "ifname": "eth0",
                          "priority": 2})"),
            LastRouteRequest());

  Json::Value del(Json::objectValue);
  del["type"] = "GTYPE_V4";
  del["ifname"] = "eth0";
  ASSERT_EQ(0, client_.DelGatewayData(del));
  EXPECT_EQ("DEL_GATEWAY_DATA", LastRouteRequest()["method"].asString());

  Json::Value slave(Json::objectValue);
  slave["type"] = "GTYPE_V4";
  slave["ifname"] = "eth0";
  slave["slave"] = true;
  ASSERT_EQ(0, client_.SetSlaveData(slave));
  Json::Value last = LastRouteRequest();
  EXPECT_EQ("SET_SLAVE_DATA", last["method"].asString());
  EXPECT_TRUE(last["slave"].asBool());

  Json::Value copy(Json::objectValue);
  copy["type"] = "GTYPE_V4";
  copy["interface_source"] = "eth0";
  copy["interface_destination"] = "eth1";
  copy["interface_source_delete"] = false;
  ASSERT_EQ(0, client_.CopyGatewayData(copy));
  EXPECT_EQ("COPY_GATEWAY_DATA", LastRouteRequest()["method"].asString());

  Json::Value refresh(Json::objectValue);
  refresh["type"] = "ALL";
  ASSERT_EQ(0, client_.RefreshGateway(refresh));
  EXPECT_EQ(ParseJson(R"({"method": "REFRESH_GATEWAY", "type": "ALL"})"), LastRouteRequest());

  Json::Value set(Json::objectValue);
  set["macAddr"] = "00:11:22:33:44:55";
  set["userdef_displayName"] = "printer";
  set["userdef_deviceType"] = "other";
  ASSERT_EQ(0, client_.SetDeviceListData(set));
  EXPECT_EQ(ParseJson(R"({"method": "set", "macAddr": "00:11:22:33:44:55",
                          "userdef_displayName": "printer", "userdef_deviceType": "other"})"),
            LastDeviceRequest());

  ASSERT_EQ(0, client_.DelDeviceListData("00:11:22:33:44:55"));
  EXPECT_EQ(ParseJson(R"({"method": "del", "macAddr": "00:11:22:33:44:55"})"), LastDeviceRequest());

  EXPECT_EQ(0, client_.ResetIPv6Module("eth0"));
}

TEST_F(Client, FailuresAreMinusOneWithTheServersText) {
  vorntest::SyslogCapture log;
  Json::Value result;
  EXPECT_EQ(-1, client_.GetDeviceListData("arp", result));
  EXPECT_EQ("failed to get upnp data", client_.LastErrorMessage());
  EXPECT_EQ("org.freedesktop.DBus.GLib.UnmappedError.Error.Code1", client_.LastErrorName());

  Json::Value bad(Json::objectValue);
  bad["type"] = "GTYPE_V4";
  bad["priority"] = "x";
  EXPECT_EQ(-1, client_.AddGatewayData(bad));
  EXPECT_EQ("failed to add gateway data", client_.LastErrorMessage());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, vorntest::LogLine("dbus_net/net_server.cpp",
                                                     "Bad request for AddGatewayData: Value is "
                                                     "not convertible to Int.")))
      << log.Dump();
  EXPECT_TRUE(service_->running());

  Json::Value fail(Json::objectValue);
  fail["fail"] = true;
  EXPECT_EQ(-1, client_.GetGatewayListData(fail, result));
  EXPECT_EQ("failed to get gateway list data", client_.LastErrorMessage());
  EXPECT_EQ(-1, client_.GetGatewayDataByInterface(fail, result));
  EXPECT_EQ(-1, client_.DelGatewayData(fail));
  EXPECT_EQ("failed to del gateway data", client_.LastErrorMessage());
  EXPECT_EQ(-1, client_.SetSlaveData(fail));
  EXPECT_EQ("failed to set slave data", client_.LastErrorMessage());
  EXPECT_EQ(-1, client_.CopyGatewayData(fail));
  EXPECT_EQ("failed to copy gateway data", client_.LastErrorMessage());
  EXPECT_EQ(-1, client_.RefreshGateway(fail));
  EXPECT_EQ("failed to refresh gateway", client_.LastErrorMessage());
  EXPECT_EQ(-1, client_.SetDeviceListData(fail));
  EXPECT_EQ("failed to set device type", client_.LastErrorMessage());
  EXPECT_FALSE(log.Matching("Call AddGatewayData failed: failed to add gateway data").empty())
      << log.Dump();
}

TEST_F(Client, IsServerReadyNeedsALivePidFileAndTheName) {
  NetClient client;
  unlink(kPidFile);
  EXPECT_FALSE(client.IsServerReady());  // the name is owned, the pid file is missing

  ASSERT_TRUE(vorntest::WriteFile(kPidFile, std::to_string(service_->pid()) + "\n"));
  EXPECT_TRUE(client.IsServerReady());

  ASSERT_TRUE(vorntest::WriteFile(kPidFile, std::to_string(DeadPid()) + "\n"));
  EXPECT_FALSE(client.IsServerReady());
}

// Runs vorn-test-net-ready against a "bus" that is only a listening socket of ours: whether the
// client connected tells whether it asked the bus.
struct ReadyProbe {
  bool connected = false;
  std::string printed;
};

ReadyProbe ProbeWithFakeBus() {
  ReadyProbe probe;
  vorntest::TempDir dir;
  std::string path = dir / "bus";
  int listener = socket(AF_UNIX, SOCK_STREAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0);
  sockaddr_un addr{};
  addr.sun_family = AF_UNIX;
  std::strncpy(addr.sun_path, path.c_str(), sizeof addr.sun_path - 1);
  EXPECT_EQ(0, bind(listener, reinterpret_cast<sockaddr*>(&addr), sizeof addr));
  EXPECT_EQ(0, listen(listener, 4));

  std::vector<std::string> env;
  for (char** e = environ; *e; ++e) {
    if (std::strncmp(*e, "DBUS_SESSION_BUS_ADDRESS=", 25) != 0) env.push_back(*e);
  }
  env.push_back("DBUS_SESSION_BUS_ADDRESS=unix:path=" + path);
  std::vector<char*> cenv;
  for (auto& e : env) cenv.push_back(const_cast<char*>(e.c_str()));
  cenv.push_back(nullptr);

  int out[2];
  EXPECT_EQ(0, pipe(out));
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_adddup2(&actions, out[1], 1);
  char* argv[] = {const_cast<char*>(VORN_TEST_NET_READY), nullptr};
  pid_t pid = -1;
  EXPECT_EQ(0, posix_spawn(&pid, argv[0], &actions, nullptr, argv, cenv.data()));
  posix_spawn_file_actions_destroy(&actions);
  close(out[1]);

  auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(10);
  int status = 0;
  for (;;) {
    int fd = accept(listener, nullptr, nullptr);
    if (fd >= 0) {
      probe.connected = true;
      close(fd);  // the client's bus goes away: it answers no
    }
    if (waitpid(pid, &status, WNOHANG) == pid) break;
    if (std::chrono::steady_clock::now() > deadline) {
      kill(pid, SIGKILL);
      waitpid(pid, &status, 0);
      break;
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
  }
  char buf[16] = {};
  ssize_t n = read(out[0], buf, sizeof buf - 1);
  if (n > 0) probe.printed.assign(buf, static_cast<size_t>(n));
  close(out[0]);
  close(listener);
  return probe;
}

TEST_F(Client, IsServerReadyDoesNotAskTheBusWhenThePidFileIsDead) {
  ASSERT_TRUE(vorntest::WriteFile(kPidFile, std::to_string(DeadPid()) + "\n"));
  ReadyProbe dead = ProbeWithFakeBus();
  EXPECT_FALSE(dead.connected);
  EXPECT_EQ("0\n", dead.printed);

  // The control: with a live pid the same client does go to the bus.
  ASSERT_TRUE(vorntest::WriteFile(kPidFile, std::to_string(getpid()) + "\n"));
  ReadyProbe alive = ProbeWithFakeBus();
  EXPECT_TRUE(alive.connected);
  EXPECT_EQ("0\n", alive.printed);
}

}  // namespace

namespace {

TEST(ClientParse, RepliesThatAreNotJsonAreFailuresWithTheirLogLine) {
  DaemonProcess garbage({VORN_TEST_NET_SERVICE, "--garbage"}, "com.vornlink.net");
  ASSERT_TRUE(garbage.ready());
  NetClient client;
  vorntest::SyslogCapture log;
  Json::Value request(Json::objectValue), result(Json::objectValue);
  result["kept"] = true;
  EXPECT_EQ(-1, client.GetDeviceListData("all", result));
  EXPECT_EQ(-1, client.GetGatewayListData(request, result));
  EXPECT_EQ(-1, client.GetGatewayDataByInterface(request, result));
  EXPECT_TRUE(result["kept"].asBool());  // the result is left as it was
  auto line = [](const std::string& m) { return vorntest::LogLine("dbus_net/net_client.cpp", m); };
  EXPECT_TRUE(log.HasOnce(LOG_ERR, line("Failed to parse upnp data"))) << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, line("Failed to get gateway list data"))) << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, line("Failed to parse gateway data by interface")))
      << log.Dump();
  // The operations without a reply only need the call to succeed.
  EXPECT_EQ(0, client.AddGatewayData(request));
  EXPECT_EQ(0, client.ResetIPv6Module("eth0"));
}

}  // namespace
