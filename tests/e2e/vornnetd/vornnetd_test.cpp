// vornnetd inside the sandbox, with gdbus and our own clients as peers: every method answers,
// bad text and bad member types get the documented errors without harming the daemon, one
// instance at a time, orderly stop on SIGTERM and SIGINT, IsServerReady, and a seeded storm of
// random requests.
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/wait.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <iterator>
#include <memory>
#include <random>
#include <regex>
#include <set>
#include <string>
#include <vector>

#include "support/daemon_process.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "vornplatform/dbus.h"
#include "vornwireless/dbus_net/net_client.h"
#include "vornwireless/utils/dbus_client.h"

namespace {

using vorntest::DaemonProcess;

using vorntest::RunResult;
using vorntest::SyslogCapture;

const char kPidFile[] = "/var/run/vornnetd.pid";
const char kErrorError[] = "org.freedesktop.DBus.GLib.ErrorError";

struct Method {
  const char* name;
  int module;
  bool json;
  const char* failure;  // the error text when its module is absent
};

const Method kMethods[] = {
    {"GetDeviceListData", 4, false, "failed to get upnp data"},
    {"SetDeviceListData", 4, true, "failed to set device type"},
    {"DelDeviceListData", 4, false, "failed to set delete data"},
    {"GetGatewayListData", 3, true, "failed to get gateway list data"},
    {"AddGatewayData", 3, true, "failed to add gateway data"},
    {"DelGatewayData", 3, true, "failed to del gateway data"},
    {"GetGatewayDataByInterface", 3, true, "failed to get gateway list data"},
    {"SetSlaveData", 3, true, "failed to set slave data"},
    {"CopyGatewayData", 3, true, "failed to copy gateway data"},
    {"RefreshGateway", 3, true, "failed to refresh gateway"},
    {"ResetIPv6Module", 2, false, "failed to reset ipv6 module"},
};

RunResult GdbusCall(const std::string& method, const std::string& arg) {
  return vorntest::Run({"/usr/bin/gdbus", "call", "--session", "--dest", "com.vornlink.net",
                        "--object-path", "/", "--method", "com.vornlink.net." + method, arg});
}

bool Ping() {
  RunResult r = vorntest::Run({"/usr/bin/gdbus", "call", "--session", "--dest", "com.vornlink.net",
                               "--object-path", "/", "--method", "org.freedesktop.DBus.Peer.Ping"});
  return r.status == 0 && r.out == "()\n";
}

std::string UnmappedError(const std::string& text) {
  return "GDBus.Error:org.freedesktop.DBus.GLib.UnmappedError.Error.Code1: " + text;
}

// One vornnetd for the test. Every module of the tree is created except the framework's sample
// (type 1), which is disabled; a module that fails to start here is a failure of the test.
class Vornnetd : public testing::Test {
 protected:
  void SetUp() override {
    SyslogCapture startLog;
    daemon_ =
        std::make_unique<DaemonProcess>(std::vector<std::string>{VORNNETD}, "com.vornlink.net");
    ASSERT_TRUE(daemon_->ready()) << startLog.Dump();
    absent_ = {1};
    for (int type = 2; type <= 5; ++type) {
      EXPECT_TRUE(
          startLog.Matching("Failed to create module \\[" + std::to_string(type) + "\\]").empty())
          << "module " << type << " did not start\n"
          << startLog.Dump();
    }
  }
  void TearDown() override {
    if (daemon_) {
      EXPECT_EQ(0, daemon_->Stop(SIGTERM));
    }
  }
  bool Absent(int module) const { return absent_.count(module) != 0; }

  std::unique_ptr<DaemonProcess> daemon_;
  std::set<int> absent_;
};

TEST_F(Vornnetd, EveryMethodAnswersAndAnAbsentModuleGivesTheMethodsFailureText) {
  for (auto const& m : kMethods) {
    SyslogCapture log;
    RunResult r = GdbusCall(m.name, m.json ? R"({"type": "GTYPE_V4", "ifname": "eth0"})" : "all");
    if (Absent(m.module)) {
      EXPECT_NE(0, r.status) << m.name;
      EXPECT_NE(std::string::npos, r.err.find(UnmappedError(m.failure))) << m.name << ": " << r.err;
      EXPECT_TRUE(log.HasOnce(
          LOG_ERR, vorntest::LogLine("network/module_manager.cpp",
                                     "Failed to find module [" + std::to_string(m.module) + "]")))
          << log.Dump();
    } else {
      // A present module answers: a reply, or an error of its own (never a lost call).
      EXPECT_TRUE(r.status == 0 || r.err.find("Error: GDBus.Error:org.freedesktop.DBus.GLib.") == 0)
          << m.name << ": " << r.err;
    }
  }
  EXPECT_TRUE(Ping());
}

TEST_F(Vornnetd, TextThatIsNotJsonGivesErrorErrorWithoutMessageFromTheHandler) {
  for (auto const& m : kMethods) {
    if (!m.json) continue;
    SyslogCapture log;
    RunResult r = GdbusCall(m.name, "this is { not json");
    EXPECT_NE(0, r.status);
    EXPECT_EQ(std::string("Error: GDBus.Error:") + kErrorError + ": Method invoked for " + m.name +
                  " returned FALSE but did not set error\n",
              r.err);
    std::string what = std::string(m.name) == "SetDeviceListData" ? "Failed to parse device data"
                                                                  : "Failed to parse info";
    EXPECT_TRUE(log.HasOnce(LOG_ERR, vorntest::LogLine("dbus_net/net_server.cpp", what)))
        << log.Dump();
  }
}

TEST_F(Vornnetd, IntrospectionShowsTheElevenMethodsWithTheirArgumentNames) {
  RunResult r = vorntest::Run({"/usr/bin/gdbus", "introspect", "--session", "--dest",
                               "com.vornlink.net", "--object-path", "/"});
  ASSERT_EQ(0, r.status) << r.err;
  std::string flat = std::regex_replace(r.out, std::regex("\\s+"), " ");
  ASSERT_NE(std::string::npos, flat.find("interface com.vornlink.net {")) << r.out;
  const char* expected[] = {
      "GetDeviceListData(in s type, out s data);",
      "SetDeviceListData(in s data);",
      "DelDeviceListData(in s mac);",
      "GetGatewayListData(in s info, out s data);",
      "AddGatewayData(in s info);",
      "DelGatewayData(in s info);",
      "GetGatewayDataByInterface(in s info, out s data);",
      "SetSlaveData(in s info);",
      "CopyGatewayData(in s info);",
      "RefreshGateway(in s type);",
      "ResetIPv6Module(in s info);",
  };
  size_t at = flat.find("interface com.vornlink.net {");
  std::string iface = flat.substr(at, flat.find("};", at) - at);
  for (const char* e : expected) EXPECT_NE(std::string::npos, iface.find(e)) << e << "\n" << iface;
  EXPECT_EQ(11, static_cast<int>(std::count(iface.begin(), iface.end(), ';'))) << iface;
}

TEST_F(Vornnetd, WrongMemberTypesDoNotHarmTheDaemon) {
  const std::pair<const char*, const char*> cases[] = {
      {"AddGatewayData", R"({"type": "GTYPE_V4", "ifname": "eth0", "priority": "x"})"},
      {"AddGatewayData", R"({"type": 5, "ifname": "eth0", "priority": 0})"},
      {"AddGatewayData", R"([{"type": "GTYPE_V4", "ifname": "eth0"}])"},
      {"GetGatewayListData", R"(["GTYPE_V4"])"},
      {"GetGatewayDataByInterface", R"({"type": ["GTYPE_V4"], "ifname": {"x": 1}})"},
      {"SetSlaveData", R"({"type": "GTYPE_V4", "ifname": "eth0", "slave": "maybe"})"},
      {"CopyGatewayData", R"({"type": "GTYPE_V4", "interface_source": 7})"},
      {"RefreshGateway", R"("ALL")"},
      {"SetDeviceListData", R"([1, 2, 3])"},
      {"SetDeviceListData", R"({"macAddr": 5, "userdef_displayName": []})"},
  };
  // Sent as they are (gdbus would read '"ALL"' as a GVariant string and drop the quotes).
  vornnetsdk::dbus::DBusClient client("com.vornlink.net", "/", "com.vornlink.net",
                                      vornnetsdk::dbus::DBUS_BUS_SESSION);
  for (auto const& c : cases) {
    SyslogCapture log;
    std::string failure;
    for (auto const& m : kMethods) {
      if (c.first == std::string(m.name)) failure = m.failure;
    }
    ASSERT_EQ(0, client.NewMessage(c.first));
    ASSERT_EQ(0, client.Append(c.second));
    int sent = client.SendMessage(true, 5000);
    // Answered with the method's failure text (or, for a present module that accepts the value
    // after conversion, a plain reply); never a lost call.
    EXPECT_TRUE(sent == 0 || client.LastErrorMessage() == failure)
        << c.first << " " << c.second << ": " << client.LastErrorName() << " "
        << client.LastErrorMessage();
    // Either the service refused it with its failure line, or the module it reached logged
    // what was wrong with it.
    int module = 0;
    for (auto const& m : kMethods) {
      if (c.first == std::string(m.name)) module = m.module;
    }
    bool refused = !log.Matching("dbus_net/net_server.cpp:\\d+ " + failure).empty();
    bool moduleSaid = sent == 0 && !Absent(module) &&
                      !log.Matching("network/[a-z_]+/[a-z_]+\\.cpp:\\d+ ").empty();
    EXPECT_TRUE(refused || moduleSaid) << c.first << " " << c.second << "\n" << log.Dump();
    ASSERT_TRUE(daemon_->running()) << c.second;
  }
  EXPECT_TRUE(Ping());
}

TEST_F(Vornnetd, ASecondInstanceExitsAtOnceAndTheFirstKeepsServing) {
  pid_t first = daemon_->pid();
  RunResult second = vorntest::Run({VORNNETD}, "", 10);
  EXPECT_EQ(1, second.status);
  EXPECT_NE(std::string::npos, second.err.find("another instance is running")) << second.err;
  EXPECT_TRUE(daemon_->running());
  EXPECT_EQ(first, vorntest::NameOwnerPid("com.vornlink.net"));
  EXPECT_EQ(std::to_string(first) + "\n", vorntest::ReadFile(kPidFile));
  EXPECT_TRUE(Ping());
}

TEST_F(Vornnetd, SigtermAndSigintRemoveTheModulesAndExitZero) {
  for (int sig : {SIGTERM, SIGINT}) {
    if (!daemon_) {
      daemon_ =
          std::make_unique<DaemonProcess>(std::vector<std::string>{VORNNETD}, "com.vornlink.net");
      ASSERT_TRUE(daemon_->ready());
    }
    SyslogCapture log;
    EXPECT_EQ(0, daemon_->Stop(sig)) << sig;
    daemon_.reset();
    EXPECT_FALSE(vorntest::Exists(kPidFile));
    EXPECT_EQ(-1, vorntest::NameOwnerPid("com.vornlink.net"));
    EXPECT_TRUE(log.HasOnce(LOG_INFO, "vornnetd/main.cpp:\\d+ Stopping on signal")) << log.Dump();
    // The modules that exist are removed, none is reported as failing to go.
    EXPECT_TRUE(log.Matching("Failed to remove module").empty()) << log.Dump();
  }
}

TEST_F(Vornnetd, IsServerReadyFollowsThePidFileAndTheBus) {
  vornnetwork::dbus::NetClient client;
  EXPECT_TRUE(client.IsServerReady());

  // The pid file naming a process that has ended: not ready, although the name is owned.
  std::string saved = vorntest::ReadFile(kPidFile);
  pid_t dead = fork();
  if (dead == 0) _exit(0);
  int status = 0;
  waitpid(dead, &status, 0);
  ASSERT_TRUE(vorntest::WriteFile(kPidFile, std::to_string(dead) + "\n"));
  EXPECT_FALSE(client.IsServerReady());
  ASSERT_TRUE(vorntest::WriteFile(kPidFile, saved));
  EXPECT_TRUE(client.IsServerReady());

  EXPECT_EQ(0, daemon_->Stop(SIGTERM));
  daemon_.reset();
  EXPECT_FALSE(client.IsServerReady());
}

// Random requests of every method: JSON objects with members of random names and types, arrays,
// scalars, truncated and plain text. Seeded, so a failure can be replayed.
std::string RandomText(std::mt19937& rng) {
  static const char* const keys[] = {"type",
                                     "ifname",
                                     "priority",
                                     "gateway",
                                     "dns",
                                     "class",
                                     "slave",
                                     "method",
                                     "interface_source",
                                     "interface_destination",
                                     "interface_source_delete",
                                     "macAddr",
                                     "userdef_displayName",
                                     "userdef_deviceType",
                                     "scannertype",
                                     "fail"};
  static const char* const values[] = {
      "\"GTYPE_V4\"", "\"GTYPE_V6\"", "\"ALL\"", "5",
      "-1",           "3.5",          "true",    "null",
      "[]",           "[1,\"a\"]",    "{}",      "{\"x\":{\"y\":[1]}}",
      "\"eth0\"",     "\"\"",         "\"x\"",   "4294967296",
      "-99999999999", "1e400",        "\"NULL\""};
  std::uniform_int_distribution<int> kind(0, 9);
  std::string text;
  switch (kind(rng)) {
    case 0:
      return "";
    case 1: {  // printable garbage
      std::uniform_int_distribution<int> len(1, 60), ch(32, 126);
      int n = len(rng);
      for (int i = 0; i < n; ++i) text += static_cast<char>(ch(rng));
      return text;
    }
    case 2:
      return values[std::uniform_int_distribution<size_t>(0, std::size(values) - 1)(rng)];
    case 3:
      return "[" + std::string(values[rng() % std::size(values)]) + "]";
    default: {
      int n = std::uniform_int_distribution<int>(0, 6)(rng);
      text = "{";
      for (int i = 0; i < n; ++i) {
        if (i) text += ",";
        text += "\"" + std::string(keys[rng() % std::size(keys)]) +
                "\":" + values[rng() % std::size(values)];
      }
      text += "}";
      if (kind(rng) == 0 && text.size() > 2) text.resize(text.size() / 2);  // truncated
      return text;
    }
  }
}

TEST_F(Vornnetd, TenThousandRandomRequestsLeaveTheDaemonAlive) {
  const unsigned seed = 20261122;
  std::mt19937 rng(seed);
  vornnetsdk::dbus::DBusClient client("com.vornlink.net", "/", "com.vornlink.net",
                                      vornnetsdk::dbus::DBUS_BUS_SESSION);
  int answered = 0, failed = 0;
  std::set<std::string> errorNames;
  for (int i = 0; i < 10000; ++i) {
    Method const& m = kMethods[rng() % std::size(kMethods)];
    std::string text = RandomText(rng);
    ASSERT_EQ(0, client.NewMessage(m.name));
    ASSERT_EQ(0, client.Append(text.c_str()));
    if (client.SendMessage(true, 5000) == 0) {
      ++answered;
    } else {
      ++failed;
      errorNames.insert(client.LastErrorName());
      // Only the two answers a handler gives; a lost call or a vanished daemon is a failure.
      ASSERT_TRUE(client.LastErrorName() == kErrorError ||
                  client.LastErrorName() == "org.freedesktop.DBus.GLib.UnmappedError.Error.Code1")
          << "seed " << seed << " request " << i << " " << m.name << " [" << text
          << "]: " << client.LastErrorName() << " " << client.LastErrorMessage();
    }
  }
  RecordProperty("answered", answered);
  RecordProperty("failed", failed);
  EXPECT_EQ(10000, answered + failed);
  EXPECT_TRUE(daemon_->running());
  EXPECT_TRUE(Ping());
  EXPECT_EQ(daemon_->pid(), vorntest::NameOwnerPid("com.vornlink.net"));
}

}  // namespace
