// The UPnP scanner against a real UPnP device (miniupnpd) in the LAN's peer host, with the WAN
// holding the default route; hostile SSDP answers from a small responder; the NC scanner's list
// file and its background search.
#include <gtest/gtest.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <chrono>
#include <memory>
#include <string>
#include <thread>

#include "lan_fixture.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "vornwireless/network/devicelist/nc_scanner.h"
#include "vornwireless/network/devicelist/upnp_scanner.h"

using vornnetwork::network::module::NCScanner;
using vornnetwork::network::module::UpnpScanner;
using vorntest::LogLine;
using vorntest::SyslogCapture;

namespace {

const char kUpnpSource[] = "network/devicelist/upnp_scanner.cpp";
const char kNcSource[] = "network/devicelist/nc_scanner.cpp";

// Waits (60 s at most) until no search runs.
bool SearchEnded() {
  for (int i = 0; i < 600; ++i) {
    if (!UpnpScanner::IsBoardCasting) return true;
    std::this_thread::sleep_for(std::chrono::milliseconds(100));
  }
  return false;
}

Json::Value Find(Json::Value const& data, std::string const& ip) {
  for (auto const& d : data["ClientList"]) {
    if (d["ipAddr"].asString() == ip) return d;
  }
  return Json::Value();
}

std::string MiniupnpdConfig() {
  std::string path = "/tmp/miniupnpd.conf";
  vorntest::WriteFile(path,
                      "ext_ifname=lo\nlistening_ip=lan0\nport=5000\n"
                      "enable_natpmp=no\nenable_upnp=yes\nsecure_mode=no\n"
                      "friendly_name=Living Room Box\n"
                      "uuid=3e0c6d1c-6f0b-4c87-9d34-3a4f0b1d2c11\n");
  return path;
}

class UpnpScannerTest : public ::testing::Test {
 protected:
  static void SetUpTestSuite() {
    std::string why;
    ASSERT_TRUE(vorntest::SetUpRouterLan(&why)) << why;
  }
  void SetUp() override { ASSERT_TRUE(SearchEnded()); }
};

TEST_F(UpnpScannerTest, FirstGetIsEmptyAndTheNextCarriesTheDevicesFriendlyNameThroughTheLan) {
  auto device = std::make_unique<vorntest::PeerProcess>(
      "lan0", std::vector<std::string>{"/usr/sbin/miniupnpd", "-d", "-f", MiniupnpdConfig()},
      "HTTP listening on port 5000");
  ASSERT_TRUE(device->ready()) << device->Output();
  UpnpScanner* scanner = UpnpScanner::Inst();
  SyslogCapture log;
  Json::Value first = scanner->GetData();
  EXPECT_EQ(first["ClientList"].size(), 0u);
  EXPECT_TRUE(UpnpScanner::IsBoardCasting);
  // A second get while the search runs starts no second search.
  scanner->GetData();
  ASSERT_TRUE(SearchEnded());
  std::string seen = device->Output();
  device.reset();  // gone: later searches find nothing
  size_t searches = 0;
  for (size_t at = 0; (at = seen.find("SSDP M-SEARCH from 10.200.1.2", at)) != std::string::npos;
       ++at) {
    ++searches;
  }
  // One search sends its M-SEARCH twice; it left through br0 although eth0 has the default route.
  EXPECT_EQ(searches, 2u) << seen;
  Json::Value found = scanner->GetData();
  Json::Value d = Find(found, "10.200.1.1");
  ASSERT_TRUE(d.isObject()) << found.toStyledString() << log.Dump() << seen;
  EXPECT_EQ(d["friendlyName"].asString(), "Living Room Box");
  EXPECT_FALSE(d.isMember("macAddr"));
  EXPECT_TRUE(d.isMember("deviceType"));
  EXPECT_TRUE(d.isMember("manufacturer"));
  EXPECT_EQ(found["ClientList"].size(), 1u) << found.toStyledString();
  ASSERT_TRUE(SearchEnded());
  // Handed out once: the next get is empty again.
  EXPECT_EQ(scanner->GetData()["ClientList"].size(), 0u);
  EXPECT_EQ(scanner->Stop(), 0);
}

TEST_F(UpnpScannerTest, StopEndsARunningSearchAtOnce) {
  UpnpScanner* scanner = UpnpScanner::Inst();
  scanner->GetData();
  ASSERT_TRUE(UpnpScanner::IsBoardCasting);
  auto start = std::chrono::steady_clock::now();
  EXPECT_EQ(scanner->Stop(), 0);
  EXPECT_FALSE(UpnpScanner::IsBoardCasting);
  // Far less than the 13-second window (only a sanity bound, not a timing assertion).
  EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(12));
}

TEST_F(UpnpScannerTest, PortTakenFailsTheSearchWithItsLogLinesAndTheNextOneRuns) {
  int fd = socket(AF_INET, SOCK_STREAM, 0);
  ASSERT_GE(fd, 0);
  int one = 1;
  setsockopt(fd, SOL_SOCKET, SO_REUSEADDR, &one, sizeof(one));
  struct sockaddr_in addr = {};
  addr.sin_family = AF_INET;
  addr.sin_port = htons(49500);
  ASSERT_EQ(bind(fd, reinterpret_cast<struct sockaddr*>(&addr), sizeof(addr)), 0);
  ASSERT_EQ(listen(fd, 1), 0);
  SyslogCapture log;
  EXPECT_EQ(UpnpScanner::Inst()->GetData()["ClientList"].size(), 0u);
  ASSERT_TRUE(SearchEnded());
  close(fd);
  EXPECT_FALSE(log.Matching("^" + std::string(kUpnpSource) +
                            ":[0-9]+ Failed to init UPNP, err=-?[0-9]+, port=49500$")
                   .empty())
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kUpnpSource, "Error: cannot start upnp")));
  // The port is free again: a new search starts and ends cleanly.
  log.Clear();
  UpnpScanner::Inst()->GetData();
  EXPECT_EQ(UpnpScanner::Inst()->Stop(), 0);
  EXPECT_TRUE(log.Matching("cannot start upnp").empty()) << log.Dump();
}

TEST_F(UpnpScannerTest, HostileLocationsAddNothingAndTheSearchEndsCleanly) {
  vorntest::PeerProcess responder("lan0", {vorntest::DeviceListFixture("ssdp-responder"), "10.200.1.1"},
                                  "ready");
  ASSERT_TRUE(responder.ready()) << responder.Output();
  UpnpScanner* scanner = UpnpScanner::Inst();
  SyslogCapture log;
  scanner->GetData();
  ASSERT_TRUE(SearchEnded()) << responder.Output();
  EXPECT_NE(responder.Output().find("search from 10.200.1.2:"), std::string::npos)
      << responder.Output();
  // Not XML, too big, cut off, unreachable, refused: each was tried, none gives a device.
  EXPECT_EQ(scanner->GetData()["ClientList"].size(), 0u);
  for (char const* location :
       {"http://10.200.1.1:8080/notxml", "http://10.200.1.1:8080/huge",
        "http://10.200.1.1:8080/cut", "http://10.200.1.250:80/d.xml", "http://10.200.1.1:9/closed"}) {
    EXPECT_FALSE(log.Matching("^" + std::string(kUpnpSource) + ":[0-9]+ description at " +
                              location + " not read: -[0-9]+$")
                     .empty())
        << location << "\n" << log.Dump();
  }
  EXPECT_EQ(scanner->Stop(), 0);
}

TEST(UpnpEvents, NullEventAndUnknownTypes) {
  SyslogCapture log;
  EXPECT_EQ(UpnpScanner::Inst()->HandleDiscovery(nullptr, 6), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kUpnpSource, "Warning: null event for handlediscovery")));
  EXPECT_EQ(UpnpScanner::CallbackEventHandler(2, nullptr, nullptr), 0);
  EXPECT_EQ(UpnpScanner::CallbackEventHandler(13, nullptr, nullptr), 0);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kUpnpSource, "Error in TvDeviceCallbackEventHandler: unknown event type 13")));
  EXPECT_TRUE(log.Matching("unknown event type 2$").empty());
}

// ---- NC ----

class NCScannerTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    unlink(VORN_FHOST_LIST_FILE);
    unlink(VORN_NC_PRIVATE_LIST_FILE);
    unlink("/tmp/nc-go");
    vorntest::Run({"/usr/bin/mkdir", "-p", "/usr/vorn/libexec/platform"});
  }
  static bool FinderEnded() {
    for (int i = 0; i < 600; ++i) {
      if (!NCScanner::IsBoardCasting) return true;
      std::this_thread::sleep_for(std::chrono::milliseconds(100));
    }
    return false;
  }
};

TEST_F(NCScannerTest, ListLinesBecomeNasDevicesAndBadLinesAreSkipped) {
  ASSERT_TRUE(vorntest::WriteFile(VORN_FHOST_LIST_FILE,
                                  "7,250,studio-nas,10.200.1.9,02:00:00:00:00:09\n"
                                  "7,100,old-box,10.200.1.8,02:00:00:00:00:08\n"
                                  "0,250,zero,10.200.1.7,02:00:00:00:00:07\n"
                                  "7,250,short\n"
                                  "\n"));
  SyslogCapture log;
  NCScanner* s = NCScanner::Inst();
  ASSERT_EQ(s->ReadFHOSTListFile(), 0);
  Json::Value data = s->GetData();
  ASSERT_TRUE(FinderEnded());
  Json::Value list = data["ClientList"];
  ASSERT_EQ(list.size(), 1u) << data.toStyledString();
  EXPECT_EQ(list[0]["deviceType"].asString(), "nas");
  EXPECT_EQ(list[0]["modelName"].asString(), "250");
  EXPECT_EQ(list[0]["manufacturer"].asString(), "Vornlink");
  EXPECT_EQ(list[0]["friendlyName"].asString(), "studio-nas");
  EXPECT_EQ(list[0]["ipAddr"].asString(), "10.200.1.9");
  EXPECT_EQ(list[0]["macAddr"].asString(), "02:00:00:00:00:09");
  // The second field 100 is skipped without a word; the others are logged.
  EXPECT_EQ(log.Matching(LogLine(kNcSource, "model number == 0")).size(), 2u) << log.Dump();
  EXPECT_EQ(log.Matching(LogLine(kNcSource, "field number < 5")).size(), 4u);
  EXPECT_TRUE(log.Matching("old-box|100").empty());
  EXPECT_EQ(vorntest::ReadFile(VORN_NC_PRIVATE_LIST_FILE), vorntest::ReadFile(VORN_FHOST_LIST_FILE));
}

TEST_F(NCScannerTest, NoFileGivesAnEmptyList) {
  EXPECT_EQ(NCScanner::Inst()->ReadFHOSTListFile(), 0);
  EXPECT_EQ(NCScanner::Inst()->GetData()["ClientList"].size(), 0u);
  ASSERT_TRUE(FinderEnded());
}

TEST_F(NCScannerTest, TheSearchRunsInTheBackgroundAndItsListComesWithTheNextGet) {
  // A host finder that writes its list only when the test lets it.
  ASSERT_TRUE(vorntest::WriteFile(
      "/usr/vorn/libexec/platform/VORNFHOSTDumpHost",
      "#!/bin/sh\nwhile [ ! -e /tmp/nc-go ]; do sleep 0.05; done\n"
      "echo '9,300,backup-nas,10.200.1.20,02:00:00:00:00:20' > /tmp/vornnc.list.tmp\n",
      0755));
  Json::Value first = NCScanner::Inst()->GetData();
  EXPECT_EQ(first["ClientList"].size(), 0u);
  EXPECT_TRUE(NCScanner::IsBoardCasting);
  vorntest::WriteFile("/tmp/nc-go", "");
  ASSERT_TRUE(FinderEnded());
  Json::Value second = NCScanner::Inst()->GetData();
  ASSERT_EQ(second["ClientList"].size(), 1u);
  EXPECT_EQ(second["ClientList"][0]["friendlyName"].asString(), "backup-nas");
  ASSERT_TRUE(FinderEnded());
  unlink("/usr/vorn/libexec/platform/VORNFHOSTDumpHost");
}

TEST_F(NCScannerTest, FailingFinderIsLogged) {
  ASSERT_TRUE(vorntest::WriteFile("/usr/vorn/libexec/platform/VORNFHOSTDumpHost",
                                  "#!/bin/sh\nexit 3\n", 0755));
  SyslogCapture log;
  NCScanner::Inst()->GetData();
  ASSERT_TRUE(FinderEnded());
  EXPECT_FALSE(log.Matching("^" + std::string(kNcSource) +
                            ":[0-9]+ VORNFHOSTDumpHost\\(\\) failed!! vornerr=\\[0x[0-9A-F]{4}\\]$")
                   .empty())
      << log.Dump();
  unlink("/usr/vorn/libexec/platform/VORNFHOSTDumpHost");
}

}  // namespace
