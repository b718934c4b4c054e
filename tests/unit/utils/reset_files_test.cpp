// Removing files and putting factory files back.
#include "vornwireless/utils/reset_files.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include "support/syslog_capture.h"
#include "support/test_util.h"

using namespace vornwireless::utils;
using vorntest::Exists;
using vorntest::LogLine;
using vorntest::ReadFile;
using vorntest::SyslogCapture;
using vorntest::TempDir;
using vorntest::WriteFile;

TEST(RemoveFile, RemovesAnExistingFileAndIgnoresAMissingOne) {
  TempDir dir;
  ASSERT_TRUE(WriteFile(dir / "f", "x"));
  SyslogCapture log;
  RemoveFile((dir / "f").c_str());
  EXPECT_FALSE(Exists(dir / "f"));
  RemoveFile((dir / "f").c_str());
  RemoveFile(nullptr);
  EXPECT_TRUE(log.Lines().empty()) << log.Dump();
}

TEST(RemoveFile, FailureIsLogged) {
  ASSERT_TRUE(vorntest::InSandbox()) << "needs the sandbox (mounts)";
  TempDir dir;
  ASSERT_TRUE(WriteFile(dir / "f", "x"));
  vorntest::ReadOnlyMount ro(dir.path());
  ASSERT_TRUE(ro.ok());
  SyslogCapture log;
  RemoveFile((dir / "f").c_str());
  EXPECT_TRUE(Exists(dir / "f"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/reset_files.cpp", "remove file " + (dir / "f") + " failed")))
      << log.Dump();
}

TEST(RemoveFiles, RemovesRegularFilesWithThePrefixOnly) {
  TempDir dir;
  ASSERT_TRUE(WriteFile(dir / "ipv6-eth0", "a"));
  ASSERT_TRUE(WriteFile(dir / "ipv6-eth1", "b"));
  ASSERT_TRUE(WriteFile(dir / "xipv6-eth0", "c"));
  ASSERT_TRUE(WriteFile(dir / "other", "d"));
  ASSERT_EQ(0, mkdir((dir / "ipv6-dir").c_str(), 0755));
  RemoveFiles(dir.path().c_str(), "ipv6-");
  EXPECT_FALSE(Exists(dir / "ipv6-eth0"));
  EXPECT_FALSE(Exists(dir / "ipv6-eth1"));
  EXPECT_TRUE(Exists(dir / "xipv6-eth0"));
  EXPECT_TRUE(Exists(dir / "other"));
  EXPECT_TRUE(Exists(dir / "ipv6-dir"));
  RemoveFiles(nullptr, "x");
  RemoveFiles((dir / "missing").c_str(), "x");
}

TEST(ResetFiles, ReplacesTargetWithTheFactoryCopy) {
  TempDir dir;
  ASSERT_EQ(0, mkdir((dir / "factory").c_str(), 0755));
  ASSERT_EQ(0, mkdir((dir / "etc").c_str(), 0755));
  ASSERT_TRUE(WriteFile(dir / "factory/wifi.conf", "factory\n"));
  ASSERT_TRUE(WriteFile(dir / "etc/wifi.conf", "changed\n"));
  ResetFiles((dir / "factory/wifi.conf").c_str(), (dir / "etc/wifi.conf").c_str());
  EXPECT_EQ("factory\n", ReadFile(dir / "etc/wifi.conf"));
}

TEST(ResetFiles, PatternsRemoveAndCopyEveryMatch) {
  TempDir dir;
  ASSERT_EQ(0, mkdir((dir / "factory").c_str(), 0755));
  ASSERT_EQ(0, mkdir((dir / "etc").c_str(), 0755));
  ASSERT_TRUE(WriteFile(dir / "factory/wifi_ap_wlan0", "f0"));
  ASSERT_TRUE(WriteFile(dir / "factory/wifi_ap_wlan1", "f1"));
  ASSERT_TRUE(WriteFile(dir / "etc/wifi_ap_wlan0", "c0"));
  ASSERT_TRUE(WriteFile(dir / "etc/wifi_ap_wlan9", "c9"));
  ASSERT_TRUE(WriteFile(dir / "etc/keep", "k"));
  ResetFiles((dir / "factory/wifi_ap_*").c_str(), (dir / "etc/wifi_ap_*").c_str());
  EXPECT_EQ("f0", ReadFile(dir / "etc/wifi_ap_wlan0"));
  EXPECT_EQ("f1", ReadFile(dir / "etc/wifi_ap_wlan1"));
  EXPECT_FALSE(Exists(dir / "etc/wifi_ap_wlan9"));
  EXPECT_EQ("k", ReadFile(dir / "etc/keep"));
}

TEST(ResetFiles, NoSourceOnlyRemovesTheTarget) {
  TempDir dir;
  ASSERT_TRUE(WriteFile(dir / "target", "t"));
  SyslogCapture log;
  ResetFiles((dir / "nothing-here").c_str(), (dir / "target").c_str());
  EXPECT_FALSE(Exists(dir / "target"));
  EXPECT_TRUE(log.Lines().empty()) << log.Dump();
}

TEST(ResetFiles, FailuresAreLogged) {
  ASSERT_TRUE(vorntest::InSandbox()) << "needs the sandbox (mounts)";
  TempDir dir;
  ASSERT_EQ(0, mkdir((dir / "ro").c_str(), 0755));
  ASSERT_TRUE(WriteFile(dir / "ro/target", "t"));
  ASSERT_TRUE(WriteFile(dir / "source", "s"));
  vorntest::ReadOnlyMount ro(dir / "ro");
  ASSERT_TRUE(ro.ok());
  SyslogCapture log;
  ResetFiles((dir / "source").c_str(), (dir / "ro/target").c_str());
  EXPECT_EQ("t", ReadFile(dir / "ro/target"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/reset_files.cpp", "Failed to remove [" + (dir / "ro/target") + "]")))
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/reset_files.cpp", "Failed to copy [" + (dir / "source") + "] to [" +
                                                                        (dir / "ro") + "]")))
      << log.Dump();
}
