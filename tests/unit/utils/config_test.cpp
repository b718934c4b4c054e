// Flat and sectioned key files: bytes on disk, round trips, every failure path and its log line,
// and the atomic rewrite of section files under SIGKILL.
#include "vornwireless/utils/config.h"

#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <random>
#include <thread>

#include "support/syslog_capture.h"
#include "support/test_util.h"

using vornwireless::utils::ConfigNoSection;
using vornwireless::utils::ConfigSection;
using vorntest::LogLine;
using vorntest::ReadFile;
using vorntest::SyslogCapture;
using vorntest::TempDir;

namespace {

// Temporary files that a writer leaves beside its target ("<name>.tmp.XXXXXX").
int CountTempFiles(const std::string& dir) {
  auto r = vorntest::Run({"/usr/bin/find", dir, "-name", "*.tmp.*"});
  int n = 0;
  for (char c : r.out) n += c == '\n';
  return n;
}

}  // namespace

TEST(ConfigSection, WriteWithNoSectionsGivesEmptyFile) {
  TempDir dir;
  ConfigSection cfg(dir / "empty.conf");
  ASSERT_TRUE(cfg.Empty());
  ASSERT_EQ(0, cfg.Write());
  EXPECT_TRUE(vorntest::Exists(dir / "empty.conf"));
  EXPECT_EQ("", ReadFile(dir / "empty.conf"));
  EXPECT_EQ(0, CountTempFiles(dir.path()));
}

TEST(ConfigSection, WritesSortedSectionsWithTabbedKeysAndMode0600) {
  TempDir dir;
  ConfigSection cfg(dir / "s.conf");
  cfg.AddKeyValue("zeta", "b", std::string("2"));
  cfg.AddKeyValue("alpha", "y", 7);
  cfg.AddKeyValue("alpha", "x", 1.5);
  cfg.AddKeyValue("zeta", "a", true);
  cfg.AddKeyValue("mid", "off", false);
  ASSERT_EQ(0, cfg.Write());
  EXPECT_EQ("[alpha]\n\tx=1.5\n\ty=7\n[mid]\n\toff=no\n[zeta]\n\ta=yes\n\tb=2\n",
            ReadFile(dir / "s.conf"));
  EXPECT_EQ(0600, vorntest::FileMode(dir / "s.conf"));
  EXPECT_EQ(0, CountTempFiles(dir.path()));
}

TEST(ConfigSection, BoolTrueIsWrittenAsYes) {
  TempDir dir;
  ConfigSection cfg(dir / "b.conf");
  cfg.AddKeyValue("general", "enabled", true);
  ASSERT_EQ(0, cfg.Write());
  ConfigSection back(dir / "b.conf");
  ASSERT_EQ(0, back.Read());
  EXPECT_EQ("yes", back.GetKeyValue("general", "enabled"));
}

TEST(ConfigSection, RoundTripKeepsEverySectionAndKey) {
  TempDir dir;
  ConfigSection cfg(dir / "r.conf");
  cfg.AddKeyValue("wlan0", "ssid", std::string("my net = home"));
  cfg.AddKeyValue("wlan0", "channel", 6);
  cfg.AddKeyValue("eth0", "mtu", 1500);
  ASSERT_EQ(0, cfg.Write());

  ConfigSection back(dir / "r.conf");
  ASSERT_EQ(0, back.Read());
  EXPECT_EQ(cfg.GetKeyValues(), back.GetKeyValues());
  EXPECT_TRUE(back.Find("eth0"));
  EXPECT_FALSE(back.Find("wlan1"));
}

TEST(ConfigSection, UnknownKeyIsCreatedEmptyAndSavedByNextWrite) {
  TempDir dir;
  ConfigSection cfg(dir / "u.conf");
  cfg.AddKeyValue("general", "a", std::string("1"));
  EXPECT_EQ("", cfg.GetKeyValue("general", "missing"));
  EXPECT_TRUE(cfg.Find("general"));
  ASSERT_EQ(0, cfg.Write());
  EXPECT_EQ("[general]\n\ta=1\n\tmissing=\n", ReadFile(dir / "u.conf"));
}

TEST(ConfigSection, DeleteSectionAndUnknownSectionDelete) {
  TempDir dir;
  ConfigSection cfg(dir / "d.conf");
  cfg.AddKeyValue("a", "k", std::string("v"));
  cfg.AddKeyValue("b", "k", std::string("v"));
  cfg.DeleteSection("nope");
  EXPECT_EQ(2u, cfg.GetKeyValues().size());
  cfg.DeleteSection("a");
  EXPECT_FALSE(cfg.Find("a"));
  ASSERT_EQ(0, cfg.Write());
  EXPECT_EQ("[b]\n\tk=v\n", ReadFile(dir / "d.conf"));
}

TEST(ConfigSection, ReadAcceptsEveryKeyLineForm) {
  TempDir dir;
  ASSERT_TRUE(vorntest::WriteFile(dir / "f.conf",
                                  "[one]\n\ttab=1\n  blanks=2\nplain=3\nquoted=\"4 4\"\n"
                                  "[two]\n\tk=v\n"));
  ConfigSection cfg(dir / "f.conf");
  ASSERT_EQ(0, cfg.Read());
  EXPECT_EQ("1", cfg.GetKeyValue("one", "tab"));
  EXPECT_EQ("2", cfg.GetKeyValue("one", "blanks"));
  EXPECT_EQ("3", cfg.GetKeyValue("one", "plain"));
  EXPECT_EQ("4 4", cfg.GetKeyValue("one", "quoted"));
  EXPECT_EQ("v", cfg.GetKeyValue("two", "k"));
}

TEST(ConfigSection, ReadKeepsSectionsThatAreOnlyInMemoryAndReplacesTheOthers) {
  TempDir dir;
  ASSERT_TRUE(vorntest::WriteFile(dir / "m.conf", "[disk]\n\tk=disk\n"));
  ConfigSection cfg(dir / "m.conf");
  cfg.AddKeyValue("memory", "k", std::string("mem"));
  cfg.AddKeyValue("disk", "stale", std::string("x"));
  ASSERT_EQ(0, cfg.Read());
  EXPECT_EQ("mem", cfg.GetKeyValue("memory", "k"));
  auto all = cfg.GetKeyValues();
  ASSERT_EQ(1u, all["disk"].size());
  EXPECT_EQ("disk", all["disk"]["k"]);
}

TEST(ConfigSection, ReadOfMissingFileFailsWithLogLine) {
  TempDir dir;
  SyslogCapture log;
  ConfigSection cfg(dir / "missing.conf");
  EXPECT_EQ(-1, cfg.Read());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/config.cpp", "[" + (dir / "missing.conf") +
                                                                   "] does not exist")))
      << log.Dump();
}

TEST(ConfigSection, ReadOfFileWithEmptySectionFails) {
  TempDir dir;
  ASSERT_TRUE(vorntest::WriteFile(dir / "e.conf", "[full]\n\tk=v\n[hollow]\n"));
  SyslogCapture log;
  ConfigSection cfg(dir / "e.conf");
  EXPECT_EQ(-1, cfg.Read());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/config.cpp", "Failed to get section [hollow] in [" +
                                                                   (dir / "e.conf") + "]")))
      << log.Dump();
}

TEST(ConfigSection, ReadOfDirectoryFailsToEnumSections) {
  TempDir dir;
  ASSERT_EQ(0, mkdir((dir / "adir").c_str(), 0755));
  SyslogCapture log;
  ConfigSection cfg(dir / "adir");
  EXPECT_EQ(-1, cfg.Read());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/config.cpp",
                                           "Failed to enum sections in [" + (dir / "adir") + "]")))
      << log.Dump();
}

TEST(ConfigSection, WriteMakesMissingDirectories) {
  TempDir dir;
  ConfigSection cfg(dir / "a/b/c.conf");
  cfg.AddKeyValue("s", "k", std::string("v"));
  ASSERT_EQ(0, cfg.Write());
  EXPECT_EQ("[s]\n\tk=v\n", ReadFile(dir / "a/b/c.conf"));
  EXPECT_EQ(0755, vorntest::FileMode(dir / "a/b"));
}

TEST(ConfigSection, WriteUnderARegularFileFailsToMakeTheDirectory) {
  TempDir dir;
  ASSERT_TRUE(vorntest::WriteFile(dir / "plain", "x"));
  SyslogCapture log;
  ConfigSection cfg(dir / "plain/sub/c.conf");
  cfg.AddKeyValue("s", "k", std::string("v"));
  EXPECT_EQ(-1, cfg.Write());
  EXPECT_EQ(1u, log.Matching(LogLine("utils/file.cpp", "Failed to mkdir [" + (dir / "plain/sub") +
                                                           "][20]")).size())
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/config.cpp", "Failed to check and make [" +
                                                                   (dir / "plain/sub") + "]")))
      << log.Dump();
  EXPECT_EQ("x", ReadFile(dir / "plain"));
}

TEST(ConfigSection, FailedRenameLeavesOldFileAndNoTemporaryFile) {
  ASSERT_TRUE(vorntest::InSandbox()) << "needs the sandbox (mounts)";
  TempDir dir;
  const std::string path = dir / "keep.conf";
  ASSERT_TRUE(vorntest::WriteFile(path, "[old]\n\tk=old\n", 0600));
  vorntest::SelfBindMount busy(path);  // rename() onto a mount point fails with EBUSY
  ASSERT_TRUE(busy.ok());

  SyslogCapture log;
  ConfigSection cfg(path);
  cfg.AddKeyValue("new", "k", std::string("new"));
  EXPECT_EQ(-1, cfg.Write());
  EXPECT_EQ("[old]\n\tk=old\n", ReadFile(path));
  EXPECT_EQ(0, CountTempFiles(dir.path()));
  auto lines = log.Matching("Failed to rename file from \\[" + path + "\\.tmp\\.[A-Za-z0-9]{6}\\] to \\[" +
                            path + "\\]$");
  ASSERT_EQ(1u, lines.size()) << log.Dump();
  EXPECT_EQ(LOG_ERR, lines[0].level);
  EXPECT_EQ(0u, lines[0].message.rfind("utils/config.cpp:", 0));
}

TEST(ConfigSection, TemporaryFileThatCannotBeCreatedFailsAndKeepsTheOldFile) {
  ASSERT_TRUE(vorntest::InSandbox()) << "needs the sandbox (mounts)";
  TempDir dir;
  const std::string path = dir / "ro.conf";
  ASSERT_TRUE(vorntest::WriteFile(path, "[old]\n\tk=old\n", 0600));
  vorntest::ReadOnlyMount ro(dir.path());
  ASSERT_TRUE(ro.ok());

  SyslogCapture log;
  ConfigSection cfg(path);
  cfg.AddKeyValue("new", "k", std::string("new"));
  EXPECT_EQ(-1, cfg.Write());
  EXPECT_EQ("[old]\n\tk=old\n", ReadFile(path));
  // mkstemp() has tried names of its own by the time it gives up.
  EXPECT_EQ(1u, log.Matching("^utils/config.cpp:[0-9]+ Failed to create a temporary file \\[" + path +
                             "\\.tmp\\.[A-Za-z0-9]{6}\\]$").size())
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/config.cpp",
                                           "Failed to create a temoprary file for [" + path + "]")))
      << log.Dump();
}

TEST(ConfigSection, SectionThatCannotBeWrittenFailsAndRemovesTheTemporaryFile) {
  TempDir dir;
  const std::string path = dir / "bad.conf";
  ASSERT_TRUE(vorntest::WriteFile(path, "[old]\n\tk=old\n", 0600));
  SyslogCapture log;
  ConfigSection cfg(path);
  // A line break inside a value would smuggle a line into the file: the writer refuses it.
  cfg.AddKeyValue("evil", "k", std::string("v\n[injected]"));
  EXPECT_EQ(-1, cfg.Write());
  EXPECT_EQ("[old]\n\tk=old\n", ReadFile(path));
  EXPECT_EQ(0, CountTempFiles(dir.path()));
  EXPECT_EQ(1u, log.Matching("^utils/config.cpp:[0-9]+ Failed to add section \\[evil\\] in \\[" + path +
                             "\\.tmp\\.[A-Za-z0-9]{6}\\]$").size())
      << log.Dump();
}

TEST(ConfigSection, RefusedKeyIsLoggedAndSkipped) {
  TempDir dir;
  SyslogCapture log;
  ConfigSection cfg(dir / "k.conf");
  cfg.AddKeyValue("s", "", std::string("orphan"));
  cfg.AddKeyValue("s", "good", std::string("1"));
  ASSERT_EQ(0, cfg.Write());
  EXPECT_EQ("[s]\n\tgood=1\n", ReadFile(dir / "k.conf"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/config.cpp", "Failed to set hash value[][orphan]")))
      << log.Dump();
}

// A writer killed at any moment leaves the complete old or the complete new file.
TEST(ConfigSection, WriteIsAtomicUnderSigkill) {
  TempDir dir;
  const std::string path = dir / "atomic.conf";
  auto fill = [](ConfigSection& cfg, const std::string& tag) {
    for (int s = 0; s < 60; ++s) {
      for (int k = 0; k < 10; ++k) {
        cfg.AddKeyValue("section" + std::to_string(s), "key" + std::to_string(k),
                        tag + std::string(40, static_cast<char>('a' + k)));
      }
    }
  };
  ConfigSection a(path), b(path);
  fill(a, "A");
  fill(b, "B");
  ASSERT_EQ(0, a.Write());
  const std::string contentA = ReadFile(path);
  ASSERT_EQ(0, b.Write());
  const std::string contentB = ReadFile(path);
  ASSERT_NE(contentA, contentB);
  ASSERT_GT(contentA.size(), 20000u);

  std::mt19937 rng(20261122);
  std::uniform_int_distribution<int> delayUs(0, 6000);
  int kills = 0;
  for (int round = 0; round < 200; ++round) {
    pid_t pid = fork();
    ASSERT_GE(pid, 0);
    if (pid == 0) {
      for (int i = 0;; ++i) ((i & 1) ? a : b).Write();
    }
    std::this_thread::sleep_for(std::chrono::microseconds(delayUs(rng)));
    kill(pid, SIGKILL);
    int status = 0;
    waitpid(pid, &status, 0);
    kills += WIFSIGNALED(status) ? 1 : 0;
    const std::string now = ReadFile(path);
    ASSERT_TRUE(now == contentA || now == contentB)
        << "round " << round << ": target holds " << now.size() << " bytes, neither version";
  }
  EXPECT_EQ(200, kills);
}

TEST(ConfigNoSection, WritesSortedKeysAndReadsThemBack) {
  TempDir dir;
  ConfigNoSection cfg(dir / "flat.conf");
  cfg.AddKeyValue("zkey", std::string("last"));
  cfg.AddKeyValue("akey", 42);
  cfg.AddKeyValue("mkey", 0.25);
  cfg.AddKeyValue("flag", true);
  cfg.AddKeyValue("off", false);
  ASSERT_EQ(0, cfg.Write());
  EXPECT_EQ("akey=42\nflag=yes\nmkey=0.25\noff=no\nzkey=last\n", ReadFile(dir / "flat.conf"));

  ConfigNoSection back(dir / "flat.conf");
  ASSERT_EQ(0, back.Read());
  EXPECT_EQ(cfg.GetKeyValues(), back.GetKeyValues());
}

TEST(ConfigNoSection, WriteReplacesTheWholeFile) {
  TempDir dir;
  ASSERT_TRUE(vorntest::WriteFile(dir / "w.conf", "old=1\n# a comment\n"));
  ConfigNoSection cfg(dir / "w.conf");
  cfg.AddKeyValue("new", std::string("2"));
  ASSERT_EQ(0, cfg.Write());
  EXPECT_EQ("new=2\n", ReadFile(dir / "w.conf"));
}

TEST(ConfigNoSection, UnknownKeyIsCreatedEmptyAndSavedByNextWrite) {
  TempDir dir;
  ConfigNoSection cfg(dir / "u.conf");
  EXPECT_EQ("", cfg.GetKeyValue("ghost"));
  ASSERT_EQ(1u, cfg.GetKeyValues().count("ghost"));
  ASSERT_EQ(0, cfg.Write());
  EXPECT_EQ("ghost=\n", ReadFile(dir / "u.conf"));
}

TEST(ConfigNoSection, ReadEmptiesTheMapAndKeepsGoodKeysOfAMalformedFile) {
  TempDir dir;
  ASSERT_TRUE(vorntest::WriteFile(dir / "m.conf",
                                  "# comment\nfirst=1\nthis line has no separator\n\n"
                                  "quoted=\"with blanks\"\n=novalue\nlast=9\n"));
  ConfigNoSection cfg(dir / "m.conf");
  cfg.AddKeyValue("stale", std::string("x"));
  ASSERT_EQ(0, cfg.Read());
  auto keys = cfg.GetKeyValues();
  EXPECT_EQ(0u, keys.count("stale"));
  EXPECT_EQ("1", keys["first"]);
  EXPECT_EQ("with blanks", keys["quoted"]);
  EXPECT_EQ("9", keys["last"]);
}

TEST(ConfigNoSection, ReadOfMissingFileFailsWithLogLine) {
  TempDir dir;
  SyslogCapture log;
  ConfigNoSection cfg(dir / "none.conf");
  EXPECT_EQ(-1, cfg.Read());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/config.cpp",
                                           "[" + (dir / "none.conf") + "] does not exist")))
      << log.Dump();
}

TEST(ConfigNoSection, WriteOnAReadOnlyFileSystemFailsToTouch) {
  ASSERT_TRUE(vorntest::InSandbox()) << "needs the sandbox (mounts)";
  TempDir dir;
  ASSERT_TRUE(vorntest::WriteFile(dir / "ro.conf", "old=1\n"));
  vorntest::ReadOnlyMount ro(dir.path());
  ASSERT_TRUE(ro.ok());
  SyslogCapture log;
  ConfigNoSection cfg(dir / "ro.conf");
  cfg.AddKeyValue("k", std::string("v"));
  EXPECT_EQ(-1, cfg.Write());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/config.cpp", "Failed to touch [" + (dir / "ro.conf") + "]")))
      << log.Dump();
  EXPECT_EQ("old=1\n", ReadFile(dir / "ro.conf"));
}

TEST(ConfigNoSection, WriteOverADirectoryFailsToSetKeysAndKeepsIt) {
  TempDir dir;
  ASSERT_EQ(0, mkdir((dir / "d").c_str(), 0755));
  ASSERT_TRUE(vorntest::WriteFile(dir / "d/keep", "x"));
  SyslogCapture log;
  ConfigNoSection cfg(dir / "d");
  cfg.AddKeyValue("k", std::string("v"));
  EXPECT_EQ(-1, cfg.Write());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/config.cpp", "Failed to set keys"))) << log.Dump();
  EXPECT_EQ("x", ReadFile(dir / "d/keep"));
}

TEST(ConfigNoSection, ValueThatCannotBeStoredFailsToSetKeys) {
  TempDir dir;
  SyslogCapture log;
  ConfigNoSection cfg(dir / "nl.conf");
  cfg.AddKeyValue("k", std::string("two\nlines"));
  EXPECT_EQ(-1, cfg.Write());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/config.cpp", "Failed to set keys"))) << log.Dump();
}

TEST(ConfigNoSection, WriteUnderARegularFileFailsToMakeTheDirectory) {
  TempDir dir;
  ASSERT_TRUE(vorntest::WriteFile(dir / "plain", "x"));
  SyslogCapture log;
  ConfigNoSection cfg(dir / "plain/x.conf");
  cfg.AddKeyValue("k", std::string("v"));
  EXPECT_EQ(-1, cfg.Write());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/config.cpp", "Failed to check and make [" +
                                                                   (dir / "plain") + "]")))
      << log.Dump();
}

TEST(Config, NameAndDirName) {
  ConfigNoSection cfg;
  cfg.SetName("/etc/iproute2/config/gateway_database");
  EXPECT_EQ("/etc/iproute2/config/gateway_database", cfg.GetNameString());
  EXPECT_STREQ("/etc/iproute2/config/gateway_database", cfg.GetNameCString());
  EXPECT_EQ("/etc/iproute2/config", cfg.GetDirName());
  cfg.SetName("plain");
  EXPECT_EQ(".", cfg.GetDirName());
  // Only the first 1023 characters of the path count.
  std::string longPath = "/" + std::string(1100, 'd') + "/file";
  cfg.SetName(longPath);
  EXPECT_EQ("/", cfg.GetDirName());
}
