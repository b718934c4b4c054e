// The device list module driven with JSON requests: merging rules, labels, deletion, the file
// kept across restarts, and every refused request with its log line.
#include "vornwireless/network/devicelist/device_list_module.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <string>

#include "lan_fixture.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"

using vornnetwork::network::module::DeviceListModule;
using vorntest::LogLine;
using vorntest::SyslogCapture;

namespace {

const char kSource[] = "network/devicelist/device_list_module.cpp";

Json::Value Device(std::string const& mac, std::string const& ip) {
  Json::Value d(Json::objectValue);
  if (!mac.empty()) d["macAddr"] = mac;
  if (!ip.empty()) d["ipAddr"] = ip;
  return d;
}

Json::Value ListOf(std::initializer_list<Json::Value> devices) {
  Json::Value l(Json::objectValue);
  l["ClientList"] = Json::Value(Json::arrayValue);
  for (auto const& d : devices) l["ClientList"].append(d);
  return l;
}

Json::Value Request(std::string const& method) {
  Json::Value r(Json::objectValue);
  r["method"] = method;
  return r;
}

Json::Value SetRequest(std::string const& mac, std::string const& name, std::string const& type) {
  Json::Value r = Request("set");
  r["macAddr"] = mac;
  r["userdef_displayName"] = name;
  r["userdef_deviceType"] = type;
  return r;
}

class DeviceListModuleTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    ASSERT_TRUE(vorntest::SetTopology("client"));  // no LAN: the scanners add nothing
    unlink(VORN_DEVICE_LIST_FILE);
  }
  Json::Value Devices() { return module.GetMergedList().GetClientList()["ClientList"]; }
  DeviceListModule module;
};

TEST_F(DeviceListModuleTest, RequestWithoutStringMethodIsRefused) {
  SyslogCapture log;
  Json::Value out;
  EXPECT_EQ(module.ProcessRequest(Json::Value(Json::objectValue), out), -1);
  Json::Value r(Json::objectValue);
  r["method"] = 3;
  EXPECT_EQ(module.ProcessRequest(r, out), -1);
  EXPECT_EQ(module.ProcessRequest(Json::Value(Json::arrayValue), out), -1);
  EXPECT_EQ(module.ProcessRequest(Json::Value("get"), out), -1);
  EXPECT_EQ(log.Matching(LogLine(kSource, "indata has no member (method) or wrong format")).size(),
            4u)
      << log.Dump();
}

TEST_F(DeviceListModuleTest, UnknownMethodIsRefused) {
  SyslogCapture log;
  Json::Value out;
  EXPECT_EQ(module.ProcessRequest(Request("list"), out), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSource, "unknown type from input (list)")));
}

TEST_F(DeviceListModuleTest, ArpAndUnknownScannerTypesAreRefused) {
  Json::Value out;
  for (char const* type : {"arp", "bogus"}) {
    SyslogCapture log;
    Json::Value r = Request("get");
    r["scannertype"] = type;
    EXPECT_EQ(module.ProcessRequest(r, out), -1);
    EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSource, std::string("unknown type from input (") +
                                                          type + ")")))
        << log.Dump();
    EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSource, "failed to get data by scannertype")));
  }
  SyslogCapture log;
  EXPECT_EQ(module.ProcessRequest(Request("get"), out), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSource, "indata has no member (scannertype) or wrong format")));
}

TEST_F(DeviceListModuleTest, ScannerGetBeforeStartFailsWithItsMessage) {
  SyslogCapture log;
  Json::Value r = Request("get");
  r["scannertype"] = "wifi";
  Json::Value out;
  EXPECT_EQ(module.ProcessRequest(r, out), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSource, "no wifi scanner when getting data")));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSource, "failed to get upnp data")));
}

TEST_F(DeviceListModuleTest, MergeRefusesAListWithoutArray) {
  SyslogCapture log;
  EXPECT_EQ(module.MergeList(Json::Value(Json::objectValue), true), -1);
  Json::Value bad(Json::objectValue);
  bad["ClientList"] = "x";
  EXPECT_EQ(module.MergeList(bad, true), -1);
  EXPECT_EQ(log.Matching(LogLine(kSource, "wrong format of input list")).size(), 2u);
}

TEST_F(DeviceListModuleTest, MergeStopsAtADeviceWithoutMacOrIpAndKeepsWhatWasMerged) {
  SyslogCapture log;
  EXPECT_EQ(module.MergeList(ListOf({Device("m1", "1.1.1.1"), Device("", ""),
                                     Device("m3", "1.1.1.3")}),
                             true),
            -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSource, "cannot get ip or mac from list object")));
  ASSERT_EQ(Devices().size(), 1u);
  EXPECT_EQ(Devices()[0]["macAddr"].asString(), "m1");
}

TEST_F(DeviceListModuleTest, MergeWithoutCreateOnlyEnrichesKnownDevices) {
  module.MergeList(ListOf({Device("m1", "1.1.1.1")}), true);
  Json::Value upnp = Device("", "1.1.1.1");
  upnp["friendlyName"] = "Living Room Box";
  Json::Value stranger = Device("", "1.1.1.99");
  stranger["friendlyName"] = "nobody";
  EXPECT_EQ(module.MergeList(ListOf({upnp, stranger, Device("m7", "1.1.1.7")}), false), 0);
  ASSERT_EQ(Devices().size(), 1u) << "a UPnP object whose IP matches no device added something";
  EXPECT_EQ(Devices()[0]["friendlyName"].asString(), "Living Room Box");
  EXPECT_EQ(Devices()[0]["displayName"].asString(), "Living Room Box");
}

TEST_F(DeviceListModuleTest, LaterSourcesOverwriteSoWifiNetifWins) {
  Json::Value arp = Device("m1", "1.1.1.1");
  arp["netif"] = "br0";
  module.MergeList(ListOf({arp}), true);
  Json::Value wifi = Device("m1", "");
  wifi["netif"] = "wlan0";
  wifi["connection"] = "wifi";
  module.MergeList(ListOf({wifi}), true);
  ASSERT_EQ(Devices().size(), 1u);
  EXPECT_EQ(Devices()[0]["netif"].asString(), "wlan0");
  EXPECT_EQ(Devices()[0]["ipAddr"].asString(), "1.1.1.1");
}

TEST_F(DeviceListModuleTest, LabelsSurviveLaterMerges) {
  module.MergeList(ListOf({Device("m1", "1.1.1.1")}), true);
  Json::Value out;
  ASSERT_EQ(module.ProcessRequest(SetRequest("m1", "Dad's laptop", "laptop"), out), 0);
  Json::Value arp = Device("m1", "1.1.1.2");
  arp["friendlyName"] = "LAPTOP-X";
  module.MergeList(ListOf({arp}), true);
  Json::Value d = Devices()[0];
  EXPECT_EQ(d["userdef_displayName"].asString(), "Dad's laptop");
  EXPECT_EQ(d["userdef_deviceType"].asString(), "laptop");
  EXPECT_EQ(d["displayName"].asString(), "LAPTOP-X");
  EXPECT_EQ(d["ipAddr"].asString(), "1.1.1.2");
}

TEST_F(DeviceListModuleTest, SetRefusesMissingEmptyAndUnknown) {
  module.MergeList(ListOf({Device("m1", "1.1.1.1")}), true);
  Json::Value before = module.GetMergedList().GetClientList();
  Json::Value out;
  {
    SyslogCapture log;
    Json::Value r = SetRequest("m1", "n", "t");
    r.removeMember("userdef_displayName");
    EXPECT_EQ(module.ProcessRequest(r, out), -1);
    EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSource, "indata has no member (userdef_displayName) or wrong format")));
    EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSource, "failed to set data")));
  }
  {
    SyslogCapture log;
    Json::Value r = SetRequest("m1", "n", "t");
    r["macAddr"] = 12;
    EXPECT_EQ(module.ProcessRequest(r, out), -1);
    EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSource, "indata has no member (macAddr) or wrong format")));
  }
  for (auto const& r : {SetRequest("", "n", "t"), SetRequest("m1", "", "t"), SetRequest("m1", "n", "")}) {
    SyslogCapture log;
    EXPECT_EQ(module.ProcessRequest(r, out), -1);
    EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSource, "input string should not be empty")));
  }
  for (char const* mac : {"m9", "M1", "not a mac", "m1 "}) {
    SyslogCapture log;
    EXPECT_EQ(module.ProcessRequest(SetRequest(mac, "n", "t"), out), -1);
    EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSource, std::string("failed to get object (") + mac +
                                                          ") from list")))
        << log.Dump();
  }
  EXPECT_EQ(module.GetMergedList().GetClientList(), before);
}

TEST_F(DeviceListModuleTest, SetIsNotWrittenToTheFileUntilTermination) {
  module.MergeList(ListOf({Device("m1", "1.1.1.1")}), true);
  Json::Value out;
  ASSERT_EQ(module.ProcessRequest(SetRequest("m1", "tv", "screen"), out), 0);
  EXPECT_FALSE(vorntest::Exists(VORN_DEVICE_LIST_FILE));
  ASSERT_EQ(module.TerminateModule(), 0);
  DeviceListModule again;
  ASSERT_EQ(again.InitialModule(), 0);
  Json::Value d = again.GetMergedList().GetClientList()["ClientList"][0];
  EXPECT_EQ(d["userdef_displayName"].asString(), "tv");
  EXPECT_EQ(d["userdef_deviceType"].asString(), "screen");
  again.TerminateModule();
}

TEST_F(DeviceListModuleTest, DeleteRemovesExactlyThatDevice) {
  module.MergeList(ListOf({Device("m1", "1.1.1.1"), Device("m2", "1.1.1.2"),
                           Device("m3", "1.1.1.3")}),
                   true);
  Json::Value r = Request("del");
  r["macAddr"] = "m2";
  Json::Value out;
  ASSERT_EQ(module.ProcessRequest(r, out), 0);
  ASSERT_EQ(Devices().size(), 2u);
  EXPECT_EQ(Devices()[0]["macAddr"].asString(), "m1");
  EXPECT_EQ(Devices()[1]["macAddr"].asString(), "m3");
}

TEST_F(DeviceListModuleTest, DeleteRefusesMissingEmptyAndUnknownAndStaysUsable) {
  module.MergeList(ListOf({Device("m1", "1.1.1.1")}), true);
  Json::Value out;
  {
    SyslogCapture log;
    EXPECT_EQ(module.ProcessRequest(Request("del"), out), -1);
    EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSource, "indata has no member (macAddr) or wrong format")));
    EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSource, "failed to del data")));
  }
  {
    SyslogCapture log;
    Json::Value r = Request("del");
    r["macAddr"] = "";
    EXPECT_EQ(module.ProcessRequest(r, out), -1);
    EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSource, "input mac should not be empty")));
  }
  {
    SyslogCapture log;
    Json::Value r = Request("del");
    r["macAddr"] = "zz";
    EXPECT_EQ(module.ProcessRequest(r, out), -1);
    EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSource, "failed to erase object (zz) from list")));
  }
  // The list is not left locked: merging and deleting still work.
  module.MergeList(ListOf({Device("m2", "1.1.1.2")}), true);
  Json::Value r = Request("del");
  r["macAddr"] = "m1";
  EXPECT_EQ(module.ProcessRequest(r, out), 0);
  ASSERT_EQ(Devices().size(), 1u);
}

TEST_F(DeviceListModuleTest, BadStartUpFilesAreSkippedAndTheModuleStartsEmpty) {
  for (std::string const& text :
       {std::string("not json at all"), std::string("[1,2,3]"), std::string("\"text\""),
        std::string("{ \"ClientList\": [ { \"macAddr\": \"m1\", \"ipA")}) {
    ASSERT_TRUE(vorntest::WriteFile(VORN_DEVICE_LIST_FILE, text));
    SyslogCapture log;
    DeviceListModule m;
    ASSERT_EQ(m.InitialModule(), 0);
    EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSource, "failed to read (/tmp/connectionlist_upnpscanner.json) to client list, skip it")))
        << text << "\n" << log.Dump();
    EXPECT_EQ(m.GetMergedList().GetClientList()["ClientList"].size(), 0u);
    // The module works on: a device merges and the file is rewritten whole.
    m.MergeList(ListOf({Device("m1", "1.1.1.1")}), true);
    ASSERT_EQ(m.TerminateModule(), 0);
    DeviceListModule again;
    again.InitialModule();
    EXPECT_EQ(again.GetMergedList().GetClientList()["ClientList"].size(), 1u);
    again.TerminateModule();
  }
}

TEST_F(DeviceListModuleTest, StartUpFileOfTheWrongShapeInsideIsReadAsEmpty) {
  ASSERT_TRUE(vorntest::WriteFile(VORN_DEVICE_LIST_FILE, "{ \"ClientList\": { \"a\": 1 } }"));
  DeviceListModule m;
  ASSERT_EQ(m.InitialModule(), 0);
  Json::Value out;
  Json::Value r = Request("del");
  r["macAddr"] = "m1";
  EXPECT_EQ(m.ProcessRequest(r, out), -1);
  EXPECT_EQ(m.ProcessRequest(SetRequest("m1", "a", "b"), out), -1);
  EXPECT_EQ(m.MergeList(ListOf({Device("m1", "1.1.1.1")}), true), 0);
  EXPECT_EQ(m.GetMergedList().GetClientList()["ClientList"].size(), 1u);
  m.TerminateModule();
}

TEST_F(DeviceListModuleTest, GetAllMergesWritesTheFileAndAnswersTheList) {
  ASSERT_EQ(module.InitialModule(), 0);
  module.MergeList(ListOf({Device("m1", "1.1.1.1")}), true);
  Json::Value r = Request("get");
  r["scannertype"] = "all";
  Json::Value out;
  ASSERT_EQ(module.ProcessRequest(r, out), 0);
  ASSERT_EQ(out["ClientList"].size(), 1u);
  EXPECT_EQ(out["ClientList"][0]["macAddr"].asString(), "m1");
  Json::Value file;
  Json::Reader reader;
  ASSERT_TRUE(reader.parse(vorntest::ReadFile(VORN_DEVICE_LIST_FILE), file));
  EXPECT_EQ(file, out);
  EXPECT_EQ(module.TerminateModule(), 0);
}

}  // namespace
