// Directory making, whole-file reads, ifcfg IPv6 copies and /proc entries.
#include "vornwireless/utils/file.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include "support/syslog_capture.h"
#include "support/test_util.h"

using namespace vornwireless::utils;
using vorntest::LogLine;
using vorntest::ReadFile;
using vorntest::SyslogCapture;
using vorntest::TempDir;

TEST(CheckAndMakeDir, MakesMissingLevelsWith0755WhateverTheModeSays) {
  TempDir dir;
  ASSERT_EQ(0, CheckAndMakeDir(dir / "x/y/z", 0700));
  EXPECT_EQ(0755, vorntest::FileMode(dir / "x"));
  EXPECT_EQ(0755, vorntest::FileMode(dir / "x/y/z"));
}

TEST(CheckAndMakeDir, ExistingDirectoryIsLeftAlone) {
  TempDir dir;
  ASSERT_EQ(0, mkdir((dir / "d").c_str(), 0711));
  ASSERT_EQ(0, chmod((dir / "d").c_str(), 0711));
  EXPECT_EQ(0, CheckAndMakeDir(dir / "d", 0755));
  EXPECT_EQ(0711, vorntest::FileMode(dir / "d"));
}

TEST(CheckAndMakeDir, FailureIsLoggedWithErrno) {
  TempDir dir;
  ASSERT_TRUE(vorntest::WriteFile(dir / "f", ""));
  SyslogCapture log;
  EXPECT_EQ(-1, CheckAndMakeDir(dir / "f/sub", 0755));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/file.cpp", "Failed to mkdir [" + (dir / "f/sub") + "][20]")))
      << log.Dump();
}

TEST(FileToStr, WholeFileOrEmpty) {
  TempDir dir;
  std::string content("line1\nline2\0binary", 18);
  ASSERT_TRUE(vorntest::WriteFile(dir / "f", content));
  EXPECT_EQ(content, FileToStr(dir / "f"));
  EXPECT_EQ("", FileToStr(dir / "missing"));
}

TEST(SetProcEntry, WritesValueAndNewline) {
  TempDir dir;
  ASSERT_TRUE(vorntest::WriteFile(dir / "entry", "0\n"));
  EXPECT_TRUE(SetProcEntry(dir / "entry", "1"));
  EXPECT_EQ("1\n", ReadFile(dir / "entry"));
  EXPECT_FALSE(SetProcEntry(dir / "no/such/entry", "1"));
}

TEST(SetProcEntry, WritesARealProcEntry) {
  ASSERT_TRUE(vorntest::InSandbox()) << "needs the sandbox (own network namespace)";
  const std::string entry = "/proc/sys/net/ipv4/conf/lo/arp_ignore";
  EXPECT_TRUE(SetProcEntry(entry, "1"));
  EXPECT_EQ("1\n", ReadFile(entry));
  EXPECT_TRUE(SetProcEntry(entry, "0"));
  EXPECT_EQ("0\n", ReadFile(entry));
}

class CopyIfcfg : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox()) << "needs the sandbox (/etc overlay)";
    ASSERT_EQ(0, CheckAndMakeDir("/etc/sysconfig/network-scripts", 0755));
  }
};

TEST_F(CopyIfcfg, CopiesTheIPv6KeysThatExist) {
  ASSERT_TRUE(vorntest::WriteFile("/etc/sysconfig/network-scripts/ifcfg-eth0",
                                  "DEVICE=eth0\nIPV6INIT=yes\nIPV6ADDR=\"2001:db8::1\"\n"
                                  "IPV6PREFIXLENG=64\nIPV6DNS=2001:db8::53\n"));
  ASSERT_TRUE(vorntest::WriteFile("/etc/sysconfig/network-scripts/ifcfg-br0",
                                  "DEVICE=br0\nIPV6_DEFAULTGW=keep\n"));
  ASSERT_EQ(0, CopyIfcfgIPv6Attrs("eth0", "br0"));
  EXPECT_EQ("DEVICE=br0\nIPV6_DEFAULTGW=keep\nIPV6INIT=yes\nIPV6ADDR=2001:db8::1\nIPV6PREFIXLENG=64\n"
            "IPV6DNS=2001:db8::53\n",
            ReadFile("/etc/sysconfig/network-scripts/ifcfg-br0"));
}

TEST_F(CopyIfcfg, FailureNamesTheKeyAndBothFiles) {
  ASSERT_TRUE(vorntest::WriteFile("/etc/sysconfig/network-scripts/ifcfg-eth1", "IPV6INIT=yes\n"));
  ASSERT_EQ(0, CheckAndMakeDir("/etc/sysconfig/network-scripts/ifcfg-blocked/sub", 0755));
  SyslogCapture log;
  EXPECT_EQ(-1, CopyIfcfgIPv6Attrs("eth1", "blocked"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/file.cpp",
                                           "Failed to copy [IPV6INIT=yes] from /etc/sysconfig/network-scripts/"
                                           "ifcfg-eth1 to /etc/sysconfig/network-scripts/ifcfg-blocked")))
      << log.Dump();
}
