// The modem registry: which information files make a modem, lookups, and the erase order of
// Update when several dongles go in one tick.
#include "vornwireless/usbmodem_lib/usbmodem_list.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <string>
#include <vector>

#include "support/syslog_capture.h"
#include "support/test_util.h"

using vornwireless::usbmodem_lib::USBModem;
using vornwireless::usbmodem_lib::USBModemList;
using vorntest::LogLine;
using vorntest::SyslogCapture;

namespace {

// An information file without USB_VENDOR: the modem is listed but its initialisation fails.
void WriteInfo(int n) {
  ASSERT_TRUE(vorntest::WriteFile("/tmp/usbmodem.info" + std::to_string(n),
                                  "DEVICENODE_PREFIX=/dev/nosuchtty\nDEVICENODE=0\n"));
}

std::vector<unsigned> Ids(USBModemList& list) {
  std::vector<unsigned> ids;
  for (USBModem& m : list) ids.push_back(m.GetIfid());
  return ids;
}

class USBModemListTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    vorntest::Run({"/bin/sh", "-c", "rm -f /tmp/usbmodem.info*"});
  }
};

TEST_F(USBModemListTest, OnlyPlainDecimalNamesMakeAModem) {
  for (const char* name : {"usbmodem.info", "usbmodem.info03", "usbmodem.info3x", "usbmodem.info-1",
                           "usbmodem.info+3", "usbmodem.info 3", "usbmodem.info99999999999",
                           "usbmodem.infox", "xusbmodem.info4"}) {
    ASSERT_TRUE(vorntest::WriteFile(std::string("/tmp/") + name, "USB_VENDOR=12d1\n"));
  }
  WriteInfo(7);
  WriteInfo(0);
  USBModemList list;
  EXPECT_EQ(list.SearchInfoPath(), 0);
  EXPECT_EQ(Ids(list), (std::vector<unsigned>{0, 7}));
  EXPECT_EQ(list.FindUSBModem(7).GetInfoPath(), "/tmp/usbmodem.info7");
  EXPECT_EQ(list.FindUSBModem(7).GetDevId(), "usbmodem7");
  // A second search adds nothing twice.
  EXPECT_EQ(list.SearchInfoPath(), 0);
  EXPECT_EQ(list.size(), 2u);
}

TEST_F(USBModemListTest, FailedLookupsGiveTheNullObject) {
  WriteInfo(3);
  USBModemList list;
  ASSERT_EQ(list.SearchInfoPath(), 0);
  USBModem& byId = list.FindUSBModem(9);
  EXPECT_TRUE(byId.IsNull());
  EXPECT_EQ(byId.GetDevId(), "");
  EXPECT_FALSE(byId.IsInited());
  EXPECT_FALSE(byId.IsInfoExist());
  EXPECT_EQ(&byId, &USBModemList::nullObject);
  EXPECT_TRUE(list.FindUSBModem(std::string("usbmodem03")).IsNull());
  EXPECT_TRUE(list.FindUSBModem(std::string("")).IsNull());
  EXPECT_TRUE(list.FindUSBModem(std::string("usbmodem3 ")).IsNull());
  EXPECT_FALSE(list.FindUSBModem(std::string("usbmodem3")).IsNull());
  EXPECT_FALSE(list.FindUSBModem(3).IsNull());
}

TEST_F(USBModemListTest, AFailedInitialisationIsLoggedAndRetriedEveryTick) {
  WriteInfo(4);
  WriteInfo(5);
  USBModemList list;
  SyslogCapture syslog;
  EXPECT_EQ(list.Update(), -1);
  ASSERT_EQ(list.size(), 2u);
  EXPECT_EQ(list[0].GetInfoState(), USBModem::INFO_FAILED);
  // The modems after the failing one wait for the next tick.
  EXPECT_EQ(list[1].GetInfoState(), USBModem::INFO_NOT_INITED);
  EXPECT_TRUE(syslog.HasOnce(LOG_ERR, LogLine("usbmodem_lib/usbmodem_list.cpp",
                                              "Failed to init info [4]")))
      << syslog.Dump();
  EXPECT_TRUE(syslog.HasOnce(LOG_ERR, LogLine("usbmodem_lib/usbmodem.cpp",
                                              "failed on setup sim handler")));
  syslog.Clear();
  EXPECT_EQ(list.Update(), -1);
  EXPECT_TRUE(syslog.HasOnce(LOG_ERR, LogLine("usbmodem_lib/usbmodem_list.cpp",
                                              "Failed to init info [4]")));
}

TEST_F(USBModemListTest, AModemWhoseFileIsGoneLeavesTheList) {
  WriteInfo(1);
  WriteInfo(2);
  USBModemList list;
  list.Update();
  ASSERT_EQ(Ids(list), (std::vector<unsigned>{1, 2}));
  unlink("/tmp/usbmodem.info2");
  list.Update();
  EXPECT_EQ(Ids(list), (std::vector<unsigned>{1}));
  unlink("/tmp/usbmodem.info1");
  list.Update();
  EXPECT_TRUE(list.empty());
}

TEST_F(USBModemListTest, TwoModemsGoneInOneTickEraseByTheCollectedIndices) {
  WriteInfo(1);
  WriteInfo(2);
  WriteInfo(3);
  USBModemList list;
  list.Update();
  ASSERT_EQ(Ids(list), (std::vector<unsigned>{1, 2, 3}));
  unlink("/tmp/usbmodem.info1");
  unlink("/tmp/usbmodem.info2");
  // Indices 0 and 1 were collected: erasing 0 moves 2 and 3 down, erasing 1 takes 3.
  list.Update();
  EXPECT_EQ(Ids(list), (std::vector<unsigned>{2}));
  // The next tick repairs it: 2 is gone now and 3 comes back as a new plug-in.
  list.Update();
  EXPECT_EQ(Ids(list), (std::vector<unsigned>{3}));
  EXPECT_TRUE(list[0].IsNewPlugIn());
}

TEST_F(USBModemListTest, AllModemsGoneInOneTickNeverEraseOutOfRange) {
  for (int i = 1; i <= 3; ++i) WriteInfo(i);
  USBModemList list;
  list.Update();
  for (int i = 1; i <= 3; ++i) unlink(("/tmp/usbmodem.info" + std::to_string(i)).c_str());
  list.Update();
  EXPECT_EQ(Ids(list), (std::vector<unsigned>{2}));
  list.Update();
  EXPECT_TRUE(list.empty());
}

TEST_F(USBModemListTest, WithoutInformationFilesTheTickSucceedsEmpty) {
  USBModemList list;
  EXPECT_EQ(list.Update(), 0);
  EXPECT_TRUE(list.empty());
}

}  // namespace
