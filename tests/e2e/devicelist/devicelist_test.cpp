// The device list module in the real vornnetd, asked over the bus with gdbus and vornnetdtool.
// The LAN is a real bridge br0 over veth lan0 and lan1 whose peer hosts are the neighbours;
// eth0 is the WAN with the default route and a neighbour of its own that must not be listed.
#include <gtest/gtest.h>
#include <signal.h>
#include <unistd.h>

#include <chrono>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "fixtures/fake_journal.h"
#include "lan_fixture.h"
#include "support/daemon_process.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"

using vorntest::DaemonProcess;
using vorntest::LogLine;
using vorntest::RunResult;
using vorntest::SyslogCapture;

namespace {

const char kListFile[] = "/tmp/connectionlist_upnpscanner.json";
const char kLeases[] = "/etc/dhcpd/dhcpd.conf.leases";
const char kHostapdCli[] = "/usr/bin/hostapd_cli";
const char kIw[] = "/usr/sbin/iw";
const char kLaptopMac[] = "02:00:00:00:01:01";   // lan0's peer, 10.200.1.1
const char kMediaboxMac[] = "02:00:00:00:01:03"; // lan1's peer, 10.200.1.3
const char kStationMac[] = "02:00:00:00:0a:01";  // a Wi-Fi station on wlan0
const char kFakeTime[] = "2026-01-02 03:04:05";

std::string Golden(std::string const& name) {
  return vorntest::ReadFile(vorntest::SourceDir() + "/tests/e2e/devicelist/golden/" + name);
}

// The string of a gdbus reply "('...',)": GVariant text unescaped.
std::string ReplyString(std::string const& out) {
  std::string s = out;
  // Single quotes, or double quotes when the text holds a single quote.
  if (s.size() < 2 || s[0] != '(' || (s[1] != '\'' && s[1] != '"')) return "<unparsed " + out + ">";
  char const quote = s[1];
  std::string text;
  for (size_t i = 2; i < s.size(); ++i) {
    char c = s[i];
    if (c == quote) break;
    if (c == '\\' && i + 1 < s.size()) {
      char n = s[++i];
      switch (n) {
        case 'n': text += '\n'; break;
        case 't': text += '\t'; break;
        case 'r': text += '\r'; break;
        default: text += n; break;
      }
      continue;
    }
    text += c;
  }
  return text;
}

RunResult Gdbus(std::string const& method, std::string const& arg) {
  return vorntest::Run({"/usr/bin/gdbus", "call", "--session", "--dest", "com.vornlink.net",
                        "--object-path", "/", "--method", "com.vornlink.net." + method, arg});
}

std::string UnmappedError(std::string const& text) {
  return "GDBus.Error:org.freedesktop.DBus.GLib.UnmappedError.Error.Code1: " + text;
}

Json::Value ParseJson(std::string const& text) {
  Json::Value v;
  Json::Reader reader;
  if (!reader.parse(text, v)) return Json::Value("<not json: " + text + ">");
  return v;
}

Json::Value FindByIp(Json::Value const& list, std::string const& ip) {
  for (auto const& d : list["ClientList"]) {
    if (d["ipAddr"].asString() == ip) return d;
  }
  return Json::Value();
}

Json::Value FindByMac(Json::Value const& list, std::string const& mac) {
  for (auto const& d : list["ClientList"]) {
    if (d["macAddr"].asString() == mac) return d;
  }
  return Json::Value();
}

class DeviceList : public ::testing::Test {
 protected:
  static void SetUpTestSuite() {
    std::string why;
    ASSERT_TRUE(vorntest::SetUpRouterLan(&why)) << why;
    // lan1 joins the bridge; its peer becomes a second LAN host.
    vorntest::IpOk({"addr", "flush", "dev", "lan1"});
    vorntest::IpOk({"link", "set", "lan1", "master", "br0"});
    ASSERT_EQ(vorntest::PeerIp("lan1", {"addr", "flush", "dev", "lan1"}).status, 0);
    ASSERT_EQ(vorntest::PeerIp("lan1", {"addr", "add", "10.200.1.3/24", "dev", "lan1"}).status, 0);
    ASSERT_EQ(vorntest::PeerIp("lan0", {"link", "set", "lan0", "address", kLaptopMac}).status, 0);
    ASSERT_EQ(vorntest::PeerIp("lan1", {"link", "set", "lan1", "address", kMediaboxMac}).status, 0);
  }
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    ASSERT_TRUE(vorntest::SetTopology("router"));
    ::mkdir("/etc/dhcpd", 0755);
    ASSERT_TRUE(vorntest::WriteFile(kLeases, std::string("1767322800 ") + kLaptopMac +
                                                 " 10.200.1.1 laptop 01:" + kLaptopMac + "\n"));
    unlink(kListFile);
    vorntest::Ip({"neigh", "flush", "dev", "br0"});
    ASSERT_TRUE(vorntest::InstallFake(kHostapdCli));
    ASSERT_TRUE(vorntest::InstallFake(kIw));
    vorntest::WriteFakeReplies(Json::Value(Json::objectValue));
    StationOn("wlan0", kStationMac);
    vorntest::WriteFile("/tmp/miniupnpd-e2e.conf",
                        "ext_ifname=lo\nlistening_ip=lan0\nport=5000\nenable_natpmp=no\n"
                        "enable_upnp=yes\nsecure_mode=no\nfriendly_name=Living Room Box\n"
                        "uuid=3e0c6d1c-6f0b-4c87-9d34-3a4f0b1d2c11\n");
  }
  void TearDown() override {
    if (daemon) {
      EXPECT_EQ(daemon->Stop(SIGTERM), 0);
      daemon.reset();
    }
  }
  // Radio fakes: hostapd knows wlan0 with one station (none for an empty MAC).
  static void StationOn(std::string const& ifname, std::string const& mac) {
    Json::Value replies(Json::objectValue);
    Json::Value e(Json::objectValue);
    e["args"].append("interface");
    e["stdout"] = "Selected interface '" + ifname + "'\n" + ifname + "\n";
    replies[kHostapdCli].append(e);
    Json::Value s(Json::objectValue);
    s["args"].append("-i");
    s["args"].append(ifname);
    s["args"].append("all_sta");
    s["stdout"] = mac.empty() ? "" : mac + "\nflags=[AUTH][ASSOC][AUTHORIZED]\n";
    replies[kHostapdCli].append(s);
    Json::Value iw(Json::objectValue);
    iw["args_prefix"].append("dev");
    iw["stdout"] = "\trx bytes:\t4096\n\ttx bytes:\t2048\n\tsignal avg:\t-61 [-61] dBm\n";
    replies[kIw].append(iw);
    vorntest::WriteFakeReplies(replies);
  }
  void StartDaemon(bool fixedTime = false) {
    std::vector<std::string> argv;
    if (fixedTime) {
      argv = {"/usr/bin/env", "LD_PRELOAD=/usr/lib/x86_64-linux-gnu/faketime/libfaketime.so.1",
              std::string("FAKETIME=") + kFakeTime, "FAKETIME_DONT_FAKE_MONOTONIC=1",
              "TZ=UTC"};
    }
    argv.push_back(VORNNETD);
    daemon = std::make_unique<DaemonProcess>(argv, "com.vornlink.net");
    ASSERT_TRUE(daemon->ready());
  }
  void RestartDaemon() {
    ASSERT_EQ(daemon->Stop(SIGTERM), 0);
    daemon.reset();
    StartDaemon();
  }
  static void Neighbours() {
    ASSERT_EQ(vorntest::PingOnce("10.200.1.1"), 0);
    ASSERT_EQ(vorntest::PingOnce(vorntest::PeerAddr("eth0")), 0);
  }
  static Json::Value GetAll() {
    RunResult r = Gdbus("GetDeviceListData", "all");
    EXPECT_EQ(r.status, 0) << r.err;
    return ParseJson(ReplyString(r.out));
  }
  std::unique_ptr<DaemonProcess> daemon;
};

TEST_F(DeviceList, GetAllInRouterTopologyMatchesTheGoldenReplyAndFile) {
  Neighbours();
  StartDaemon(true);
  RunResult r = Gdbus("GetDeviceListData", "all");
  ASSERT_EQ(r.status, 0) << r.err;
  EXPECT_EQ(ReplyString(r.out), Golden("all_router.reply"));
  EXPECT_EQ(vorntest::ReadFile(kListFile), Golden("all_router.file"));
}

TEST_F(DeviceList, BridgeNeighboursAreNamedFromLeasesOrNetbiosAndTheWanNeighbourIsNot) {
  vorntest::PeerProcess responder("lan1",
                                  {vorntest::DeviceListFixture("netbios-responder"), "MEDIABOX",
                                   "HOME"},
                                  "ready");
  ASSERT_TRUE(responder.ready());
  Neighbours();
  ASSERT_EQ(vorntest::PingOnce("10.200.1.3"), 0);
  StartDaemon();
  Json::Value all = GetAll();
  Json::Value laptop = FindByMac(all, kLaptopMac);
  EXPECT_EQ(laptop["friendlyName"].asString(), "laptop") << all.toStyledString();
  EXPECT_EQ(laptop["netif"].asString(), "br0");
  Json::Value box = FindByMac(all, kMediaboxMac);
  EXPECT_EQ(box["friendlyName"].asString(), "MEDIABOX") << all.toStyledString();
  EXPECT_EQ(box["ipAddr"].asString(), "10.200.1.3");
  EXPECT_TRUE(FindByIp(all, vorntest::PeerAddr("eth0")).isNull()) << "the WAN neighbour is listed";
  Json::Value station = FindByMac(all, kStationMac);
  EXPECT_EQ(station["netif"].asString(), "wlan0");
  EXPECT_EQ(station["connection"].asString(), "wifi");
  EXPECT_EQ(station["signalstrength"].asInt(), 60);
}

TEST_F(DeviceList, LabelsSurviveMergesAndARestartAndDeleteRemovesExactlyThatDevice) {
  Neighbours();
  StartDaemon();
  GetAll();
  RunResult set = Gdbus("SetDeviceListData",
                        std::string("{\"macAddr\": \"") + kStationMac +
                            "\", \"userdef_displayName\": \"Anna's phone\", "
                            "\"userdef_deviceType\": \"phone\"}");
  ASSERT_EQ(set.status, 0) << set.err;
  Json::Value after = FindByMac(GetAll(), kStationMac);
  EXPECT_EQ(after["userdef_displayName"].asString(), "Anna's phone");
  EXPECT_EQ(after["userdef_deviceType"].asString(), "phone");
  EXPECT_EQ(after["netif"].asString(), "wlan0");
  RestartDaemon();
  Json::Value restarted = GetAll();
  EXPECT_EQ(FindByMac(restarted, kStationMac)["userdef_displayName"].asString(), "Anna's phone");
  // The station leaves the radio; deleting it removes it and nothing else.
  StationOn("wlan0", "");
  RunResult del = Gdbus("DelDeviceListData", kStationMac);
  ASSERT_EQ(del.status, 0) << del.err;
  Json::Value gone = GetAll();
  EXPECT_TRUE(FindByMac(gone, kStationMac).isNull()) << gone.toStyledString();
  EXPECT_FALSE(FindByMac(gone, kLaptopMac).isNull());
  EXPECT_EQ(gone["ClientList"].size(), restarted["ClientList"].size() - 1);
}

TEST_F(DeviceList, ToolListsSetsAndDeletes) {
  Neighbours();
  StartDaemon();
  RunResult list = vorntest::Run({VORNNETDTOOL, "device", "list"});
  ASSERT_EQ(list.status, 0) << list.err;
  Json::Value all = ParseJson(list.out);
  ASSERT_FALSE(FindByMac(all, kLaptopMac).isNull()) << list.out;
  RunResult set = vorntest::Run({VORNNETDTOOL, "device", "set", "--mac", kLaptopMac, "--name",
                                 "Work laptop", "--device-type", "laptop"});
  ASSERT_EQ(set.status, 0) << set.err;
  Json::Value labelled = FindByMac(ParseJson(vorntest::Run({VORNNETDTOOL, "device", "list", "all"}).out), kLaptopMac);
  EXPECT_EQ(labelled["userdef_displayName"].asString(), "Work laptop");
  EXPECT_EQ(vorntest::Run({VORNNETDTOOL, "device", "del", kLaptopMac}).status, 0);
  EXPECT_NE(vorntest::Run({VORNNETDTOOL, "device", "del", kLaptopMac}).status, 0);
  RunResult wifi = vorntest::Run({VORNNETDTOOL, "device", "list", "wifi"});
  ASSERT_EQ(wifi.status, 0) << wifi.err;
  EXPECT_EQ(ParseJson(wifi.out)["ClientList"][0]["macAddr"].asString(), kStationMac);
  EXPECT_NE(vorntest::Run({VORNNETDTOOL, "device", "list", "arp"}).status, 0);
}

TEST_F(DeviceList, ArpUnknownTypesAndBadRequestsGetTheErrorsAndLoseNothing) {
  Neighbours();
  StartDaemon();
  Json::Value before = GetAll();
  for (char const* type : {"arp", "ARP", "", "everything"}) {
    RunResult r = Gdbus("GetDeviceListData", type);
    EXPECT_NE(r.status, 0);
    EXPECT_NE(r.err.find(UnmappedError("failed to get upnp data")), std::string::npos) << r.err;
  }
  std::vector<std::string> badSets = {
      "{}",
      "{\"userdef_displayName\": \"a\", \"userdef_deviceType\": \"b\"}",
      "{\"macAddr\": \"\", \"userdef_displayName\": \"a\", \"userdef_deviceType\": \"b\"}",
      "{\"macAddr\": \"zz:zz\", \"userdef_displayName\": \"a\", \"userdef_deviceType\": \"b\"}",
      "{\"macAddr\": \"02:00:00:00:99:99\", \"userdef_displayName\": \"a\", \"userdef_deviceType\": \"b\"}",
      "{\"macAddr\": 7, \"userdef_displayName\": \"a\", \"userdef_deviceType\": \"b\"}",
      "[1, 2]",
  };
  for (auto const& body : badSets) {
    RunResult r = Gdbus("SetDeviceListData", body);
    EXPECT_NE(r.status, 0) << body;
    EXPECT_NE(r.err.find(UnmappedError("failed to set device type")), std::string::npos)
        << body << ": " << r.err;
  }
  // One megabyte of request: refused as unknown, the daemon goes on.
  std::string huge = std::string("{\"macAddr\": \"") + std::string(1 << 20, 'a') +
                     "\", \"userdef_displayName\": \"a\", \"userdef_deviceType\": \"b\"}";
  // Too long for a command line: sent with python's D-Bus binding, the text on stdin.
  RunResult big = vorntest::Run(
      {"/usr/bin/python3", "-c",
       "import sys, dbus\n"
       "o = dbus.SessionBus().get_object('com.vornlink.net', '/')\n"
       "try:\n"
       "    o.SetDeviceListData(sys.stdin.read(), dbus_interface='com.vornlink.net')\n"
       "except dbus.DBusException as e:\n"
       "    print(e.get_dbus_name(), e.get_dbus_message())\n"},
      huge);
  EXPECT_EQ(big.out,
            "org.freedesktop.DBus.GLib.UnmappedError.Error.Code1 failed to set device type\n")
      << big.err;
  for (char const* mac : {"", "02:00:00:00:99:99", "not-a-mac"}) {
    RunResult r = Gdbus("DelDeviceListData", mac);
    EXPECT_NE(r.status, 0);
    EXPECT_NE(r.err.find(UnmappedError("failed to set delete data")), std::string::npos) << r.err;
  }
  // Nothing was lost or torn, and the list is not left locked.
  // (Other hosts may have joined the neighbour table meanwhile; none of the earlier ones went.)
  Json::Value after = GetAll();
  for (auto const& d : before["ClientList"]) {
    Json::Value now = FindByMac(after, d["macAddr"].asString());
    EXPECT_EQ(now["ipAddr"], d["ipAddr"]);
    EXPECT_EQ(now["netif"], d["netif"]);
    EXPECT_EQ(now["displayName"], d["displayName"]);
    EXPECT_FALSE(now.isMember("userdef_displayName"));
  }
  EXPECT_EQ(ParseJson(vorntest::ReadFile(kListFile)), after);
}

TEST_F(DeviceList, BadStartUpFilesAreSkippedAndRewrittenWhole) {
  Neighbours();
  for (std::string const& text : {std::string("garbage"), std::string("[\"a\"]"),
                                  std::string("{\"ClientList\": [{\"macAddr\": \"02:")}) {
    ASSERT_TRUE(vorntest::WriteFile(kListFile, text));
    SyslogCapture log;
    StartDaemon();
    Json::Value all = GetAll();
    EXPECT_FALSE(FindByMac(all, kLaptopMac).isNull());
    EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("network/devicelist/device_list_module.cpp",
                                             "failed to read (/tmp/connectionlist_upnpscanner.json) to client list, skip it")))
        << log.Dump();
    EXPECT_EQ(ParseJson(vorntest::ReadFile(kListFile)), all);
    ASSERT_EQ(daemon->Stop(SIGTERM), 0);
    daemon.reset();
  }
}

TEST_F(DeviceList, UpnpDataArrivesAfterTheSearchAndUpnpGivesTheRawListOnce) {
  auto device = std::make_unique<vorntest::PeerProcess>(
      "lan0", std::vector<std::string>{"/usr/sbin/miniupnpd", "-d", "-f", "/tmp/miniupnpd-e2e.conf"},
      "HTTP listening on port 5000");
  ASSERT_TRUE(device->ready()) << device->Output();
  Neighbours();
  StartDaemon();
  Json::Value first = GetAll();
  Json::Value laptop = FindByIp(first, "10.200.1.1");
  EXPECT_EQ(laptop["friendlyName"].asString(), "laptop");
  EXPECT_FALSE(laptop.isMember("deviceType"));
  // The device has answered and served its description: it may go now.
  bool served = false;
  for (int i = 0; i < 300 && !served; ++i) {
    served = device->Output().find("GET /rootDesc.xml") != std::string::npos;
    if (!served) std::this_thread::sleep_for(std::chrono::milliseconds(100));
  }
  ASSERT_TRUE(served) << device->Output();
  device.reset();
  Json::Value enriched;
  for (int i = 0; i < 300; ++i) {
    enriched = FindByIp(GetAll(), "10.200.1.1");
    if (enriched.isMember("deviceType")) break;
    std::this_thread::sleep_for(std::chrono::milliseconds(100));
  }
  EXPECT_EQ(enriched["friendlyName"].asString(), "Living Room Box");
  EXPECT_EQ(enriched["macAddr"].asString(), kLaptopMac);
  EXPECT_EQ(enriched["displayName"].asString(), "Living Room Box");
}

TEST_F(DeviceList, UpnpTypeGivesTheRawListOnceThenAnEmptyOne) {
  auto device = std::make_unique<vorntest::PeerProcess>(
      "lan0", std::vector<std::string>{"/usr/sbin/miniupnpd", "-d", "-f", "/tmp/miniupnpd-e2e.conf"},
      "HTTP listening on port 5000");
  ASSERT_TRUE(device->ready()) << device->Output();
  StartDaemon();
  RunResult first = Gdbus("GetDeviceListData", "upnp");
  ASSERT_EQ(first.status, 0);
  EXPECT_EQ(ParseJson(ReplyString(first.out))["ClientList"].size(), 0u);
  bool served = false;
  for (int i = 0; i < 300 && !served; ++i) {
    served = device->Output().find("GET /rootDesc.xml") != std::string::npos;
    if (!served) std::this_thread::sleep_for(std::chrono::milliseconds(100));
  }
  ASSERT_TRUE(served) << device->Output();
  device.reset();
  Json::Value raw;
  for (int i = 0; i < 300; ++i) {
    raw = ParseJson(ReplyString(Gdbus("GetDeviceListData", "upnp").out));
    if (raw["ClientList"].size() > 0) break;
    std::this_thread::sleep_for(std::chrono::milliseconds(100));
  }
  ASSERT_EQ(raw["ClientList"].size(), 1u) << raw.toStyledString();
  Json::Value d = raw["ClientList"][0];
  EXPECT_EQ(d["ipAddr"].asString(), "10.200.1.1");
  EXPECT_EQ(d["friendlyName"].asString(), "Living Room Box");
  EXPECT_FALSE(d.isMember("macAddr"));
  RunResult again = Gdbus("GetDeviceListData", "upnp");
  EXPECT_EQ(ParseJson(ReplyString(again.out))["ClientList"].size(), 0u);
}

TEST_F(DeviceList, SigtermDuringAUpnpSearchExitsCleanly) {
  Neighbours();
  StartDaemon();
  GetAll();  // starts the search
  SyslogCapture log;
  EXPECT_EQ(daemon->Stop(SIGTERM), 0);
  daemon.reset();
  EXPECT_TRUE(log.Matching("upnp search did not end").empty()) << log.Dump();
  // The merged list was written at termination.
  EXPECT_FALSE(FindByMac(ParseJson(vorntest::ReadFile(kListFile)), kLaptopMac).isNull());
}

TEST_F(DeviceList, NoIpv4InterfaceFailsOnlyTheSearch) {
  vorntest::IpOk({"addr", "flush", "dev", "br0"});
  vorntest::IpOk({"addr", "flush", "dev", "eth0"});
  vorntest::IpOk({"addr", "flush", "dev", "lo"});
  SyslogCapture log;
  StartDaemon();
  RunResult r = Gdbus("GetDeviceListData", "all");
  EXPECT_EQ(r.status, 0) << r.err;
  EXPECT_EQ(daemon->Stop(SIGTERM), 0);
  daemon.reset();
  vorntest::IpOk({"addr", "add", "127.0.0.1/8", "dev", "lo"});
  vorntest::IpOk({"addr", "add", "10.200.1.2/24", "dev", "br0"});
  vorntest::IpOk({"addr", "add", std::string(std::getenv("VORN_LOCAL_eth0_ADDR")) + "/24", "dev", "eth0"});
  vorntest::Ip({"route", "replace", "default", "via", vorntest::PeerAddr("eth0"), "dev", "eth0"});
  EXPECT_FALSE(log.Matching("Error: cannot start upnp").empty()) << log.Dump();
}

}  // namespace
