// The device store: lookups by MAC and IP with their stopping rule, updates, display names,
// deletion order, the file form and loading of good and bad files.
#include "vornwireless/network/devicelist/client_list.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <chrono>
#include <future>
#include <regex>
#include <string>
#include <thread>

#include "support/syslog_capture.h"
#include "support/test_util.h"

using vornnetwork::network::module::ClientList;
using vorntest::LogLine;
using vorntest::ReadFile;
using vorntest::SyslogCapture;
using vorntest::TempDir;
using vorntest::WriteFile;

namespace {

const char kSource[] = "network/devicelist/client_list.cpp";

Json::Value Obj(std::initializer_list<std::pair<char const*, char const*>> members) {
  Json::Value v(Json::objectValue);
  for (auto const& m : members) v[m.first] = m.second;
  return v;
}

Json::Value Devices(ClientList& list) { return list.GetClientList()["ClientList"]; }

TEST(ClientList, StartsWithAnEmptyArray) {
  ClientList list;
  Json::Value doc = list.GetClientList();
  ASSERT_TRUE(doc.isObject());
  EXPECT_EQ(doc.size(), 1u);
  ASSERT_TRUE(doc["ClientList"].isArray());
  EXPECT_EQ(doc["ClientList"].size(), 0u);
}

TEST(ClientList, NewDeviceByMacGetsMacDisplayNameAndTime) {
  ClientList list;
  ASSERT_TRUE(list.UpdateKeysByMac("aa:bb:cc:00:00:01",
                                   Obj({{"ipAddr", "10.0.0.5"}, {"netif", "br0"}}), true));
  Json::Value d = Devices(list)[0];
  EXPECT_EQ(d["macAddr"].asString(), "aa:bb:cc:00:00:01");
  EXPECT_EQ(d["ipAddr"].asString(), "10.0.0.5");
  EXPECT_EQ(d["netif"].asString(), "br0");
  EXPECT_EQ(d["displayName"].asString(), "General DMA");
  EXPECT_TRUE(std::regex_match(d["asso_time"].asString(),
                               std::regex("\\d\\d:\\d\\d:\\d\\d \\d{4}/\\d\\d/\\d\\d")))
      << d["asso_time"].asString();
}

TEST(ClientList, UnknownMacWithoutCreateChangesNothingAndSucceeds) {
  ClientList list;
  EXPECT_TRUE(list.UpdateKeysByMac("aa:bb:cc:00:00:01", Obj({{"modelName", "x"}}), false));
  EXPECT_EQ(Devices(list).size(), 0u);
}

TEST(ClientList, UpdateCopiesMembersAndKeepsTheOthers) {
  ClientList list;
  list.UpdateKeysByMac("m1", Obj({{"ipAddr", "1.1.1.1"}, {"userdef_displayName", "tv"}}), true);
  ASSERT_TRUE(list.UpdateKeysByMac("m1", Obj({{"ipAddr", "1.1.1.2"}, {"netif", "br1"}}), false));
  Json::Value d = Devices(list)[0];
  EXPECT_EQ(d["ipAddr"].asString(), "1.1.1.2");
  EXPECT_EQ(d["netif"].asString(), "br1");
  EXPECT_EQ(d["userdef_displayName"].asString(), "tv");
  EXPECT_EQ(Devices(list).size(), 1u);
}

TEST(ClientList, EmptyKeyOrMemberlessObjectFailsWithItsLogLine) {
  ClientList list;
  SyslogCapture log;
  EXPECT_FALSE(list.UpdateKeysByMac("", Obj({{"a", "b"}}), true));
  EXPECT_FALSE(list.UpdateKeysByIP("", Obj({{"a", "b"}}), true));
  EXPECT_FALSE(list.UpdateKeysByMac("m", Json::Value(Json::objectValue), true));
  EXPECT_FALSE(list.UpdateKeysByMac("m", Json::Value("text"), true));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSource, "Error: UpdateKeys - MAC address is empty")))
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSource, "Error: UpdateKeys - IP address is empty")));
  EXPECT_EQ(log.Matching(LogLine(kSource, "Error: UpdateKeys - json object member number (0)"))
                .size(),
            2u);
  EXPECT_EQ(Devices(list).size(), 0u);
}

TEST(ClientList, DeviceMadeByIpHasNoMacAndHidesLaterDevicesFromMacLookups) {
  ClientList list;
  list.UpdateKeysByMac("m1", Obj({{"ipAddr", "1.1.1.1"}}), true);
  ASSERT_TRUE(list.UpdateKeysByIP("1.1.1.9", Obj({{"friendlyName", "printer"}}), true));
  list.UpdateKeysByMac("m2", Obj({{"ipAddr", "1.1.1.2"}}), true);
  Json::Value d = Devices(list)[1];
  EXPECT_EQ(d["ipAddr"].asString(), "1.1.1.9");
  EXPECT_FALSE(d.isMember("macAddr"));
  unsigned int index = 99;
  EXPECT_TRUE(list.VerifyMacIsExist("m1", index));
  EXPECT_EQ(index, 0u);
  EXPECT_FALSE(list.VerifyMacIsExist("m2", index));
  // So an update of m2 by MAC appends a second m2 instead of finding the first.
  list.UpdateKeysByMac("m2", Obj({{"netif", "br0"}}), true);
  EXPECT_EQ(Devices(list).size(), 4u);
  // Lookups by IP still see all of them.
  EXPECT_TRUE(list.VerifyIPIsExist("1.1.1.2", index));
  EXPECT_EQ(index, 2u);
}

TEST(ClientList, DeviceWithoutIpStopsIpLookupsAndFindMacByIp) {
  ClientList list;
  list.UpdateKeysByMac("m1", Obj({{"netif", "wlan0"}}), true);  // no ipAddr
  list.UpdateKeysByMac("m2", Obj({{"ipAddr", "1.1.1.2"}}), true);
  unsigned int index = 0;
  EXPECT_FALSE(list.VerifyIPIsExist("1.1.1.2", index));
  EXPECT_EQ(list.FindMacByIP("1.1.1.2"), "");
}

TEST(ClientList, FindMacByIpGivesTheMacOrEmpty) {
  ClientList list;
  list.UpdateKeysByMac("m1", Obj({{"ipAddr", "1.1.1.1"}}), true);
  list.UpdateKeysByIP("1.1.1.7", Obj({{"modelName", "cam"}}), true);
  EXPECT_EQ(list.FindMacByIP("1.1.1.1"), "m1");
  EXPECT_EQ(list.FindMacByIP("1.1.1.7"), "");
  EXPECT_EQ(list.FindMacByIP("1.1.1.8"), "");
}

TEST(ClientList, MacMatchIsExactTextSoCaseMatters) {
  ClientList list;
  list.UpdateKeysByMac("aa:bb:cc:dd:ee:ff", Obj({{"netif", "br0"}}), true);
  unsigned int index = 0;
  EXPECT_FALSE(list.VerifyMacIsExist("AA:BB:CC:DD:EE:FF", index));
  EXPECT_TRUE(list.VerifyMacIsExist("aa:bb:cc:dd:ee:ff", index));
}

TEST(ClientList, EmptyFriendlyNameWithModelNameShowsTheModelName) {
  ClientList list;
  list.UpdateKeysByMac("m1", Obj({{"friendlyName", ""}, {"modelName", "NAS 2000"}}), true);
  EXPECT_EQ(Devices(list)[0]["displayName"].asString(), "NAS 2000");
}

TEST(ClientList, DisplayNamePrefersFriendlyThenDescriptionThenModelAndIgnoresUserLabel) {
  std::string name;
  ClientList::DetermineDisplayName(
      Obj({{"friendlyName", "a"}, {"modelDescription", "b"}, {"modelName", "c"}}), name);
  EXPECT_EQ(name, "a");
  ClientList::DetermineDisplayName(Obj({{"modelDescription", "b"}, {"modelName", "c"}}), name);
  EXPECT_EQ(name, "b");
  ClientList::DetermineDisplayName(Obj({{"userdef_displayName", "mine"}}), name);
  EXPECT_EQ(name, "General DMA");
}

TEST(ClientList, AssoTimeChangesOnEveryUpdateEvenWithoutNewData) {
  ClientList list;
  list.UpdateKeysByMac("m1", Obj({{"netif", "br0"}}), true);
  std::string first = Devices(list)[0]["asso_time"].asString();
  // The time text has one-second resolution: wait for the next second.
  std::string now = ClientList::GetLocalTime();
  while (ClientList::GetLocalTime() == now) usleep(20000);
  list.UpdateKeysByMac("m1", Obj({{"netif", "br0"}}), false);
  EXPECT_NE(Devices(list)[0]["asso_time"].asString(), first);
}

TEST(ClientList, DeletingTheMiddleDeviceMovesTheLastIntoItsPlace) {
  ClientList list;
  list.UpdateKeysByMac("m1", Obj({{"netif", "a"}}), true);
  list.UpdateKeysByMac("m2", Obj({{"netif", "b"}}), true);
  list.UpdateKeysByMac("m3", Obj({{"netif", "c"}}), true);
  list.UpdateKeysByMac("m4", Obj({{"netif", "d"}}), true);
  ASSERT_TRUE(list.EraseObject("m2"));
  Json::Value d = Devices(list);
  ASSERT_EQ(d.size(), 3u);
  EXPECT_EQ(d[0]["macAddr"].asString(), "m1");
  EXPECT_EQ(d[1]["macAddr"].asString(), "m4");
  EXPECT_EQ(d[2]["macAddr"].asString(), "m3");
  unsigned int index = 0;
  EXPECT_TRUE(list.VerifyMacIsExist("m4", index));
  EXPECT_EQ(index, 1u);
  EXPECT_FALSE(list.VerifyMacIsExist("m2", index));
}

TEST(ClientList, DeletingUnknownMacFailsAndLeavesTheListUsable) {
  ClientList list;
  EXPECT_FALSE(list.EraseObject("m1"));  // empty list
  list.UpdateKeysByMac("m1", Obj({{"netif", "a"}}), true);
  EXPECT_FALSE(list.EraseObject("zz"));
  // Every locked operation still runs: nothing is left holding the list's mutex.
  auto done = std::async(std::launch::async, [&list] {
    bool ok = list.UpdateKeysByMac("m2", Obj({{"netif", "b"}}), true);
    ok = list.EraseObject("m1") && ok;
    list.EraseList();
    return ok;
  });
  ASSERT_EQ(done.wait_for(std::chrono::seconds(20)), std::future_status::ready);
  EXPECT_TRUE(done.get());
  EXPECT_EQ(Devices(list).size(), 0u);
}

TEST(ClientList, GetObjectAndFindKey) {
  ClientList list;
  list.UpdateKeysByMac("m1", Obj({{"friendlyName", "tv"}, {"modelName", ""}}), true);
  Json::Value o;
  ASSERT_TRUE(list.GetObject("m1", o));
  EXPECT_EQ(o["friendlyName"].asString(), "tv");
  EXPECT_FALSE(list.GetObject("m9", o));
  EXPECT_EQ(list.FindKey("m1", "friendlyName"), "tv");
  EXPECT_EQ(list.FindKey("m1", "modelName"), "");
  EXPECT_EQ(list.FindKey("m1", "nothing"), "");
  EXPECT_EQ(list.FindKey("m9", "friendlyName"), "");
}

TEST(ClientList, WritesTheDocumentTabIndentedWithClientListAtTheTop) {
  TempDir dir;
  ClientList list;
  Json::Value o(Json::objectValue);
  o["ipAddr"] = "10.1.1.2";
  o["signalstrength"] = 77;
  list.UpdateKeysByMac("m1", o, true);
  std::string path = dir / "list.json";
  ASSERT_TRUE(list.WriteToFile(path));
  std::string text = ReadFile(path);
  std::string time = Devices(list)[0]["asso_time"].asString();
  EXPECT_EQ(text,
            "{\n"
            "\t\"ClientList\" : \n"
            "\t[\n"
            "\t\t{\n"
            "\t\t\t\"asso_time\" : \"" + time + "\",\n"
            "\t\t\t\"displayName\" : \"General DMA\",\n"
            "\t\t\t\"ipAddr\" : \"10.1.1.2\",\n"
            "\t\t\t\"macAddr\" : \"m1\",\n"
            "\t\t\t\"signalstrength\" : 77\n"
            "\t\t}\n"
            "\t]\n"
            "}\n");
  EXPECT_EQ(vorntest::FileMode(path), 0644);
}

TEST(ClientList, WriteToUnopenablePathFailsAndLogs) {
  ClientList list;
  SyslogCapture log;
  EXPECT_FALSE(list.WriteToFile("/nonexistent-dir/x.json"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSource, "Error - /nonexistent-dir/x.json could not open")))
      << log.Dump();
}

TEST(ClientList, WrittenFileLoadsBackTheSameDocument) {
  TempDir dir;
  ClientList a;
  a.UpdateKeysByMac("m1", Obj({{"ipAddr", "1.1.1.1"}, {"userdef_displayName", "x"}}), true);
  a.UpdateKeysByIP("1.1.1.3", Obj({{"modelName", "cam"}}), true);
  ASSERT_TRUE(a.WriteToFile(dir / "f"));
  ClientList b;
  ASSERT_TRUE(b.Load(dir / "f"));
  EXPECT_EQ(b.GetClientList(), a.GetClientList());
  EXPECT_EQ(b.FindMacByIP("1.1.1.1"), "m1");
}

TEST(ClientList, LoadingAFileWithoutClientListGivesAnEmptyList) {
  TempDir dir;
  ASSERT_TRUE(WriteFile(dir / "f", "{ \"other\": 1 }"));
  ClientList list;
  ASSERT_TRUE(list.Load(dir / "f"));
  Json::Value doc = list.GetClientList();
  EXPECT_FALSE(doc.isMember("ClientList"));
  unsigned int index = 0;
  EXPECT_FALSE(list.VerifyMacIsExist("m1", index));
  EXPECT_EQ(list.FindMacByIP("1.1.1.1"), "");
  EXPECT_FALSE(list.EraseObject("m1"));
  // A new device starts the array again.
  EXPECT_TRUE(list.UpdateKeysByMac("m1", Obj({{"netif", "br0"}}), true));
  EXPECT_EQ(Devices(list).size(), 1u);
  EXPECT_EQ(list.GetClientList()["other"].asInt(), 1);
}

TEST(ClientList, ClientListOfTheWrongTypeIsReadAsEmpty) {
  TempDir dir;
  ASSERT_TRUE(WriteFile(dir / "f", "{ \"ClientList\": \"nope\" }"));
  ClientList list;
  ASSERT_TRUE(list.Load(dir / "f"));
  unsigned int index = 0;
  EXPECT_FALSE(list.VerifyMacIsExist("m1", index));
  EXPECT_TRUE(list.UpdateKeysByMac("m1", Obj({{"netif", "br0"}}), true));
  EXPECT_EQ(Devices(list).size(), 1u);
}

TEST(ClientList, NonObjectDevicesAndOddKeyTypesDoNotCrash) {
  TempDir dir;
  ASSERT_TRUE(WriteFile(dir / "f",
                        "{ \"ClientList\": [ {\"macAddr\": 5, \"ipAddr\": [1]}, "
                        "{\"macAddr\": \"m2\", \"ipAddr\": \"1.1.1.2\"}, 7 ] }"));
  ClientList list;
  ASSERT_TRUE(list.Load(dir / "f"));
  unsigned int index = 0;
  EXPECT_TRUE(list.VerifyMacIsExist("m2", index));
  EXPECT_EQ(index, 1u);
  EXPECT_TRUE(list.UpdateKeysByMac("m2", Obj({{"netif", "br0"}}), false));
  EXPECT_TRUE(list.UpdateKeysByMac("m3", Obj({{"netif", "br0"}}), true));
  EXPECT_FALSE(list.VerifyMacIsExist("m3", index));  // behind the 7, which has no MAC
  EXPECT_TRUE(list.EraseObject("m2"));
}

TEST(ClientList, BadFilesFailToLoadWithTheirLogLineAndKeepTheList) {
  TempDir dir;
  ClientList list;
  list.UpdateKeysByMac("m1", Obj({{"netif", "br0"}}), true);
  Json::Value before = list.GetClientList();
  SyslogCapture log;
  EXPECT_FALSE(list.Load(dir / "missing"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kSource, "Error: LoadClientList - " + (dir / "missing") +
                                                        " could not open")))
      << log.Dump();
  ASSERT_TRUE(WriteFile(dir / "bad", "this is not json"));
  EXPECT_FALSE(list.Load(dir / "bad"));
  ASSERT_TRUE(WriteFile(dir / "cut", "{ \"ClientList\": [ {\"macAddr\": \"m"));
  EXPECT_FALSE(list.Load(dir / "cut"));
  EXPECT_EQ(log.Matching(LogLine(kSource, "Error: LoadClientList - Json::Reader::parse failed"))
                .size(),
            2u);
  ASSERT_TRUE(WriteFile(dir / "array", "[1, 2]"));
  EXPECT_FALSE(list.Load(dir / "array"));
  EXPECT_EQ(list.GetClientList(), before);
}

TEST(ClientList, IndexFollowsKeyChangesAndDuplicatesLikeAWalk) {
  ClientList list;
  list.UpdateKeysByMac("m1", Obj({{"ipAddr", "1.1.1.1"}}), true);
  list.UpdateKeysByMac("m2", Obj({{"ipAddr", "1.1.1.1"}}), true);  // same IP twice
  EXPECT_EQ(list.FindMacByIP("1.1.1.1"), "m1");
  list.UpdateKeysByMac("m1", Obj({{"ipAddr", "1.1.1.5"}}), false);  // m1 moves away
  EXPECT_EQ(list.FindMacByIP("1.1.1.1"), "m2");
  EXPECT_EQ(list.FindMacByIP("1.1.1.5"), "m1");
  // An update may even change the MAC member itself.
  list.UpdateKeysByMac("m2", Obj({{"macAddr", "m9"}}), false);
  unsigned int index = 0;
  EXPECT_FALSE(list.VerifyMacIsExist("m2", index));
  EXPECT_TRUE(list.VerifyMacIsExist("m9", index));
  EXPECT_EQ(index, 1u);
}

TEST(ClientList, ConcurrentUpdatesAndCopiesKeepEveryDevice) {
  ClientList list;
  std::thread writer([&list] {
    for (int i = 0; i < 2000; ++i) {
      list.UpdateKeysByIP("10.0." + std::to_string(i / 250) + "." + std::to_string(i % 250),
                          Obj({{"friendlyName", "x"}}), true);
    }
  });
  for (int i = 0; i < 200; ++i) (void)list.GetClientList();
  writer.join();
  EXPECT_EQ(Devices(list).size(), 2000u);
}

}  // namespace
