#include "vornplatform/file.h"

#include <dirent.h>
#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

#include "support/test_util.h"
#include "vornplatform/err.h"

namespace {

using vorntest::Exists;
using vorntest::FileMode;
using vorntest::ReadFile;
using vorntest::TempDir;
using vorntest::WriteFile;

std::vector<std::string> ListDir(const std::string& dir) {
  std::vector<std::string> names;
  DIR* d = opendir(dir.c_str());
  if (d == nullptr) return names;
  while (const struct dirent* de = readdir(d)) {
    if (std::strcmp(de->d_name, ".") != 0 && std::strcmp(de->d_name, "..") != 0) {
      names.emplace_back(de->d_name);
    }
  }
  closedir(d);
  std::sort(names.begin(), names.end());
  return names;
}

std::vector<std::string> Items(PVLIBSZLIST l) {
  std::vector<std::string> v;
  for (int i = 0; i < VLIBCSzListCount(l); ++i) v.emplace_back(VLIBCSzListGet(l, i));
  return v;
}

std::vector<std::pair<std::string, std::string>> Pairs(PVLIBSZHASH h) {
  std::vector<std::pair<std::string, std::string>> v;
  for (int i = 0; i < h->nSlot; ++i) {
    if (h->pSlots[i].szKey != nullptr) v.emplace_back(h->pSlots[i].szKey, h->pSlots[i].szValue);
  }
  return v;
}

using KV = std::vector<std::pair<std::string, std::string>>;

PVLIBSZHASH MakeHash(const KV& kv) {
  PVLIBSZHASH h = VLIBCSzHashAlloc(4);
  for (const auto& p : kv) VLIBCSzHashSetValue(h, p.first.c_str(), p.second.c_str());
  return h;
}

std::string GetKey(const std::string& path, const std::string& key, int* rc = nullptr) {
  char buf[1024];
  const int r = VLIBCFileGetKeyValue(path.c_str(), key.c_str(), buf, sizeof buf, 0);
  if (rc != nullptr) *rc = r;
  return r > 0 ? std::string(buf) : std::string();
}

class FileTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_FALSE(dir_.path().empty());
    VLIBCErrClear();
  }
  std::string P(const std::string& name) const { return dir_ / name; }
  TempDir dir_;
};

// ---------------------------------------------------------------------------------------------
// Exist, CheckDir, Touch

TEST_F(FileTest, ExistAndCheckDir) {
  WriteFile(P("f"), "x");
  mkdir(P("d").c_str(), 0755);
  EXPECT_EQ(VLIBCFileExist(P("f").c_str()), 1);
  EXPECT_EQ(VLIBCFileExist(P("d").c_str()), 1);
  EXPECT_EQ(VLIBCFileExist(P("none").c_str()), 0);
  EXPECT_EQ(VLIBCFileExist(nullptr), 0);
  EXPECT_EQ(VLIBCFileExist(""), 0);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_BAD_PARAMETER);
  EXPECT_EQ(VLIBCFileCheckDir(P("d").c_str()), 1);
  EXPECT_EQ(VLIBCFileCheckDir(P("f").c_str()), 0);
  EXPECT_EQ(VLIBCFileCheckDir(P("none").c_str()), 0);
  EXPECT_EQ(VLIBCFileCheckDir(nullptr), 0);
  EXPECT_EQ(VLIBCFileCheckDir(""), 0);
}

TEST_F(FileTest, TouchCreatesEmptyFileAndKeepsContent) {
  EXPECT_EQ(VLIBCFileTouch(P("new").c_str()), 0);
  EXPECT_TRUE(Exists(P("new")));
  EXPECT_EQ(ReadFile(P("new")), "");

  WriteFile(P("old"), "content\n");
  struct timespec times[2] = {{1000, 0}, {1000, 0}};
  ASSERT_EQ(utimensat(AT_FDCWD, P("old").c_str(), times, 0), 0);
  EXPECT_EQ(VLIBCFileTouch(P("old").c_str()), 0);
  struct stat st;
  ASSERT_EQ(stat(P("old").c_str(), &st), 0);
  EXPECT_GT(st.st_mtime, 1000);
  EXPECT_EQ(ReadFile(P("old")), "content\n");

  mkdir(P("d").c_str(), 0755);
  EXPECT_EQ(VLIBCFileTouch(P("d").c_str()), 0);
}

TEST_F(FileTest, TouchFailures) {
  EXPECT_LT(VLIBCFileTouch(P("missing/dir/f").c_str()), 0);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_NOT_FOUND);
  EXPECT_LT(VLIBCFileTouch(nullptr), 0);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_BAD_PARAMETER);
  EXPECT_LT(VLIBCFileTouch(""), 0);
}

// ---------------------------------------------------------------------------------------------
// EnumDir

class EnumDirTest : public FileTest {
 protected:
  void SetUp() override {
    FileTest::SetUp();
    WriteFile(P("usbmodem.info"), "");
    WriteFile(P("usbmodem.info.2"), "");
    WriteFile(P("xusbmodem.info"), "");
    mkdir(P("usbmodem.infodir").c_str(), 0755);
    ASSERT_EQ(symlink("usbmodem.info", P("usbmodem.infolink").c_str()), 0);
    ASSERT_EQ(symlink("nowhere", P("usbmodem.infodangling").c_str()), 0);
    list_ = VLIBCSzListAlloc(1024);
  }
  void TearDown() override { VLIBCSzListFree(list_); }
  int Enum(const std::string& prefix, unsigned flags, const std::string& dir = "") {
    return VLIBCFileEnumDir((dir.empty() ? dir_.path() : dir).c_str(), prefix.c_str(), &list_,
                            flags);
  }
  PVLIBSZLIST list_ = nullptr;
};

TEST_F(EnumDirTest, FilesWithPrefixSorted) {
  EXPECT_EQ(Enum("usbmodem.info", VLIBC_ENUM_DIR_FILE), 3);
  EXPECT_EQ(Items(list_),
            (std::vector<std::string>{"usbmodem.info", "usbmodem.info.2", "usbmodem.infolink"}));
}

TEST_F(EnumDirTest, PrefixIsNotASubstring) {
  EXPECT_EQ(Enum("xusb", VLIBC_ENUM_DIR_ANY), 1);
  EXPECT_EQ(Enum("modem", VLIBC_ENUM_DIR_ANY), 0);
  EXPECT_EQ(Items(list_), std::vector<std::string>{});
}

TEST_F(EnumDirTest, KindsSelectEntries) {
  EXPECT_EQ(Enum("usbmodem.info", VLIBC_ENUM_DIR_ANY), 5);
  EXPECT_EQ(Enum("usbmodem.info", 0), 5);
  EXPECT_EQ(Enum("usbmodem.info", VLIBC_ENUM_DIR_DIR), 1);
  EXPECT_EQ(Items(list_), std::vector<std::string>{"usbmodem.infodir"});
  EXPECT_EQ(Enum("usbmodem.info", VLIBC_ENUM_DIR_LINK), 2);
  EXPECT_EQ(Items(list_), (std::vector<std::string>{"usbmodem.infodangling", "usbmodem.infolink"}));
  EXPECT_EQ(Enum("usbmodem.info", VLIBC_ENUM_DIR_FILE | VLIBC_ENUM_DIR_DIR), 4);
}

TEST_F(EnumDirTest, EmptyOrNullPrefixTakesAllButDots) {
  EXPECT_EQ(Enum("", VLIBC_ENUM_DIR_ANY), 6);
  EXPECT_EQ(VLIBCFileEnumDir(dir_.path().c_str(), nullptr, &list_, VLIBC_ENUM_DIR_ANY), 6);
  for (const auto& n : Items(list_)) {
    EXPECT_NE(n, ".");
    EXPECT_NE(n, "..");
  }
}

TEST_F(EnumDirTest, FullPathAndListIsCleanedFirst) {
  VLIBCSzListPush(&list_, "stale");
  EXPECT_EQ(Enum("usbmodem.info.", VLIBC_ENUM_DIR_FULLPATH | VLIBC_ENUM_DIR_FILE), 1);
  EXPECT_EQ(Items(list_), std::vector<std::string>{dir_ / "usbmodem.info.2"});
  EXPECT_EQ(
      Enum("usbmodem.info.", VLIBC_ENUM_DIR_FULLPATH | VLIBC_ENUM_DIR_FILE, dir_.path() + "//"), 1);
  EXPECT_EQ(Items(list_), std::vector<std::string>{dir_ / "usbmodem.info.2"});
}

// /sys/class/net holds symbolic links to the devices' directories.
TEST_F(EnumDirTest, SysClassNetLikeLinksToDirectories) {
  mkdir(P("devices").c_str(), 0755);
  mkdir(P("net").c_str(), 0755);
  for (const char* n : {"wlan0", "wlan1", "gwlan0", "eth0", "wlan10"}) {
    mkdir(P(std::string("devices/") + n).c_str(), 0755);
    ASSERT_EQ(symlink((std::string("../devices/") + n).c_str(), P(std::string("net/") + n).c_str()),
              0);
  }
  const std::string net = P("net") + "/";
  EXPECT_EQ(Enum("wlan", 0x442, net), 3);
  EXPECT_EQ(Items(list_),
            (std::vector<std::string>{P("net/wlan0"), P("net/wlan1"), P("net/wlan10")}));
  EXPECT_EQ(Enum("wlan", VLIBC_ENUM_DIR_FILE, net), 0);  // links to directories are no files
  EXPECT_EQ(Enum("wlan", VLIBC_ENUM_DIR_DIR, net), 3);
  EXPECT_EQ(Enum("eth", 0, net), 1);
  EXPECT_EQ(Items(list_), std::vector<std::string>{"eth0"});
}

TEST_F(EnumDirTest, RealSysClassNet) {
  struct stat st;
  ASSERT_EQ(0, lstat("/sys/class/net/lo", &st)) << "no /sys/class/net/lo here";
  EXPECT_EQ(VLIBCFileEnumDir("/sys/class/net/", "lo", &list_, 0x442), 1);
  EXPECT_EQ(Items(list_), std::vector<std::string>{"/sys/class/net/lo"});
}

TEST_F(EnumDirTest, Failures) {
  EXPECT_LT(Enum("", 0, P("missing")), 0);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_NOT_FOUND);
  EXPECT_LT(Enum("", 0, P("usbmodem.info")), 0);  // not a directory
  EXPECT_LT(VLIBCFileEnumDir(nullptr, "", &list_, 0), 0);
  EXPECT_LT(VLIBCFileEnumDir("", "", &list_, 0), 0);
  EXPECT_LT(VLIBCFileEnumDir(dir_.path().c_str(), "", nullptr, 0), 0);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_BAD_PARAMETER);
}

TEST_F(EnumDirTest, NullListIsAllocated) {
  PVLIBSZLIST l = nullptr;
  EXPECT_EQ(VLIBCFileEnumDir(dir_.path().c_str(), "xusb", &l, 0), 1);
  ASSERT_NE(l, nullptr);
  VLIBCSzListFree(l);
}

// ---------------------------------------------------------------------------------------------
// Key files

const char kKeyFile[] =
    "# vorn info\n"
    "a=1\n"
    "  b=2\n"
    "\tc=3\n"
    "d=\"quoted value\"\n"
    "e=\n"
    "f = spaced \n"
    "# g=commented\n"
    "this line is garbage\n"
    "\n"
    "h=\"\"\n"
    "i=x=y\n"
    "j=crlf\r\n"
    "a=duplicate\n";

TEST_F(FileTest, GetKeyValueReadsEveryForm) {
  WriteFile(P("k"), kKeyFile);
  int rc = 0;
  EXPECT_EQ(GetKey(P("k"), "a", &rc), "1");
  EXPECT_EQ(rc, 1);
  EXPECT_EQ(GetKey(P("k"), "b"), "2");
  EXPECT_EQ(GetKey(P("k"), "c"), "3");
  EXPECT_EQ(GetKey(P("k"), "d", &rc), "quoted value");
  EXPECT_EQ(rc, 12);
  EXPECT_EQ(GetKey(P("k"), "f"), "spaced");
  EXPECT_EQ(GetKey(P("k"), "i"), "x=y");
  EXPECT_EQ(GetKey(P("k"), "j"), "crlf");
  GetKey(P("k"), "e", &rc);
  EXPECT_EQ(rc, 0) << "an empty value reads as absent";
  GetKey(P("k"), "h", &rc);
  EXPECT_EQ(rc, 0);
  GetKey(P("k"), "g", &rc);
  EXPECT_EQ(rc, 0) << "a commented key is absent";
  GetKey(P("k"), "# g", &rc);
  EXPECT_EQ(rc, 0);
  GetKey(P("k"), "nokey", &rc);
  EXPECT_EQ(rc, 0);
}

TEST_F(FileTest, GetKeyValueMissingFileIsAbsent) {
  int rc = -5;
  GetKey(P("none"), "a", &rc);
  EXPECT_EQ(rc, 0);
  GetKey(P("nodir/none"), "a", &rc);
  EXPECT_EQ(rc, 0);
  EXPECT_FALSE(Exists(P("none")));
}

TEST_F(FileTest, GetKeyValueErrors) {
  WriteFile(P("k"), "long=" + std::string(100, 'v') + "\n");
  char small[10] = "garbage";
  EXPECT_LT(VLIBCFileGetKeyValue(P("k").c_str(), "long", small, sizeof small, 0), 0);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_TOO_LONG);
  EXPECT_STREQ(small, "");
  char buf[200];
  EXPECT_EQ(VLIBCFileGetKeyValue(P("k").c_str(), "long", buf, 101, 0), 100);
  EXPECT_LT(VLIBCFileGetKeyValue(P("k").c_str(), "long", buf, 100, 0), 0);

  mkdir(P("adir").c_str(), 0755);
  EXPECT_LT(VLIBCFileGetKeyValue(P("adir").c_str(), "a", buf, sizeof buf, 0), 0);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_IO);
  EXPECT_LT(VLIBCFileGetKeyValue(nullptr, "a", buf, sizeof buf, 0), 0);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_BAD_PARAMETER);
  EXPECT_LT(VLIBCFileGetKeyValue("", "a", buf, sizeof buf, 0), 0);
  EXPECT_LT(VLIBCFileGetKeyValue(P("k").c_str(), nullptr, buf, sizeof buf, 0), 0);
  EXPECT_LT(VLIBCFileGetKeyValue(P("k").c_str(), "", buf, sizeof buf, 0), 0);
  EXPECT_LT(VLIBCFileGetKeyValue(P("k").c_str(), "a", nullptr, 10, 0), 0);
  EXPECT_LT(VLIBCFileGetKeyValue(P("k").c_str(), "a", buf, 0, 0), 0);
  const std::string longKey(VLIBC_KEY_MAX + 1, 'k');
  EXPECT_LT(VLIBCFileGetKeyValue(P("k").c_str(), longKey.c_str(), buf, sizeof buf, 0), 0);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_TOO_LONG);
}

TEST_F(FileTest, SetKeyValueRoundTripsEveryFormat) {
  const std::string path = P("k");
  EXPECT_EQ(VLIBCFileSetKeyValue(path.c_str(), "plain", "v1", "%s=%s\n"), 0);
  EXPECT_EQ(VLIBCFileSetKeyValue(path.c_str(), "tabbed", "v2", "\t%s=%s\n"), 0);
  EXPECT_EQ(VLIBCFileSetKeyValue(path.c_str(), "quoted", "v 3", "%s=\"%s\"\n"), 0);
  EXPECT_EQ(VLIBCFileSetKeyValue(path.c_str(), "pct", "50", "%s=%s%%\n"), 0);
  EXPECT_EQ(ReadFile(path), "plain=v1\n\ttabbed=v2\nquoted=\"v 3\"\npct=50%\n");
  EXPECT_EQ(GetKey(path, "plain"), "v1");
  EXPECT_EQ(GetKey(path, "tabbed"), "v2");
  EXPECT_EQ(GetKey(path, "quoted"), "v 3");
  EXPECT_EQ(GetKey(path, "pct"), "50%");
  EXPECT_EQ(ListDir(dir_.path()), std::vector<std::string>{"k"}) << "no temporary file left";
}

TEST_F(FileTest, SetKeyValueKeepsUnknownLinesInPlace) {
  WriteFile(P("k"), kKeyFile);
  EXPECT_EQ(VLIBCFileSetKeyValue(P("k").c_str(), "c", "new", "%s=\"%s\"\n"), 0);
  EXPECT_EQ(VLIBCFileSetKeyValue(P("k").c_str(), "a", "one", "%s=%s\n"), 0);
  EXPECT_EQ(VLIBCFileSetKeyValue(P("k").c_str(), "z", "last", "%s=%s\n"), 0);
  EXPECT_EQ(ReadFile(P("k")),
            "# vorn info\n"
            "a=one\n"
            "  b=2\n"
            "c=\"new\"\n"
            "d=\"quoted value\"\n"
            "e=\n"
            "f = spaced \n"
            "# g=commented\n"
            "this line is garbage\n"
            "\n"
            "h=\"\"\n"
            "i=x=y\n"
            "j=crlf\r\n"
            "z=last\n");
}

TEST_F(FileTest, SetKeyValueAppendsAfterLastLineWithoutNewline) {
  WriteFile(P("k"), "x=1");
  EXPECT_EQ(VLIBCFileSetKeyValue(P("k").c_str(), "y", "2", "%s=%s\n"), 0);
  EXPECT_EQ(ReadFile(P("k")), "x=1\ny=2\n");
}

TEST_F(FileTest, SetKeyValueKeepsModeAndWritesThroughLinks) {
  WriteFile(P("k"), "a=1\n", 0600);
  EXPECT_EQ(VLIBCFileSetKeyValue(P("k").c_str(), "a", "2", "%s=%s\n"), 0);
  EXPECT_EQ(FileMode(P("k")), 0600);
  ASSERT_EQ(symlink("k", P("link").c_str()), 0);
  EXPECT_EQ(VLIBCFileSetKeyValue(P("link").c_str(), "a", "3", "%s=%s\n"), 0);
  struct stat st;
  ASSERT_EQ(lstat(P("link").c_str(), &st), 0);
  EXPECT_TRUE(S_ISLNK(st.st_mode));
  EXPECT_EQ(ReadFile(P("k")), "a=3\n");
}

TEST_F(FileTest, SetKeyValueRefusesBadInputAndLeavesFileUnchanged) {
  const std::string before = "# keep me\na=1\ngarbage\n";
  WriteFile(P("k"), before);
  const std::string p = P("k");
  const char* path = p.c_str();
  const std::string longKey(VLIBC_KEY_MAX + 1, 'k');
  const std::string longValue(VLIBC_VALUE_MAX + 1, 'v');
  EXPECT_EQ(VLIBCFileSetKeyValue(path, longKey.c_str(), "v", "%s=%s\n"), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_TOO_LONG);
  EXPECT_EQ(VLIBCFileSetKeyValue(path, "a", longValue.c_str(), "%s=%s\n"), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_TOO_LONG);
  for (const char* fmt : {"%s\n", "%s=%s=%s\n", "%s=%d\n", "%s=%s %x\n", "%s\n%s\n", "%s=%", "",
                          static_cast<const char*>(nullptr)}) {
    VLIBCErrClear();
    EXPECT_EQ(VLIBCFileSetKeyValue(path, "a", "2", fmt), -1) << (fmt ? fmt : "NULL");
    EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_BAD_PARAMETER);
  }
  for (const char* key :
       {"", "a=b", "a\nb", " a", "#a", "[a]", static_cast<const char*>(nullptr)}) {
    EXPECT_EQ(VLIBCFileSetKeyValue(path, key, "2", "%s=%s\n"), -1) << (key ? key : "NULL");
  }
  EXPECT_EQ(VLIBCFileSetKeyValue(path, "a", "x\ny", "%s=%s\n"), -1);
  EXPECT_EQ(VLIBCFileSetKeyValue(path, "a", nullptr, "%s=%s\n"), -1);
  EXPECT_EQ(VLIBCFileSetKeyValue(nullptr, "a", "1", "%s=%s\n"), -1);
  EXPECT_EQ(VLIBCFileSetKeyValue("", "a", "1", "%s=%s\n"), -1);
  EXPECT_EQ(ReadFile(p), before);
  EXPECT_EQ(ListDir(dir_.path()), std::vector<std::string>{"k"});
}

TEST_F(FileTest, SetKeyValueMaxLengthsAreAccepted) {
  const std::string key(VLIBC_KEY_MAX, 'k');
  const std::string value(VLIBC_VALUE_MAX, 'v');
  EXPECT_EQ(VLIBCFileSetKeyValue(P("k").c_str(), key.c_str(), value.c_str(), "%s=%s\n"), 0);
  std::vector<char> buf(VLIBC_VALUE_MAX + 1);
  EXPECT_EQ(VLIBCFileGetKeyValue(P("k").c_str(), key.c_str(), buf.data(),
                                 static_cast<int>(buf.size()), 0),
            VLIBC_VALUE_MAX);
}

TEST_F(FileTest, OverlongStoredLinesAreKeptButNotKeys) {
  const std::string longLine = "big=" + std::string(VLIBC_VALUE_MAX + 1, 'v');
  WriteFile(P("k"), longLine + "\na=1\n");
  int rc = -1;
  GetKey(P("k"), "big", &rc);
  EXPECT_EQ(rc, 0);
  EXPECT_EQ(VLIBCFileSetKeyValue(P("k").c_str(), "a", "2", "%s=%s\n"), 0);
  EXPECT_EQ(ReadFile(P("k")), longLine + "\na=2\n");
}

TEST_F(FileTest, SetKeyValueCreatesFileButNotDirectory) {
  EXPECT_EQ(VLIBCFileSetKeyValue(P("new.conf").c_str(), "k", "v", "%s=%s\n"), 0);
  EXPECT_EQ(ReadFile(P("new.conf")), "k=v\n");
  EXPECT_EQ(FileMode(P("new.conf")), 0644);
  EXPECT_EQ(VLIBCFileSetKeyValue(P("nodir/new.conf").c_str(), "k", "v", "%s=%s\n"), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_NOT_FOUND);
  EXPECT_FALSE(Exists(P("nodir")));
}

TEST_F(FileTest, SetKeyValueDropsLaterDuplicates) {
  WriteFile(P("k"), "a=1\nb=2\na=3\n a=4\n");
  EXPECT_EQ(VLIBCFileSetKeyValue(P("k").c_str(), "a", "9", "%s=%s\n"), 0);
  EXPECT_EQ(ReadFile(P("k")), "a=9\nb=2\n");
}

// A write that fails half-way (here: the file size limit, as a full disk would) leaves the
// target as it was and no temporary file behind.
TEST_F(FileTest, FailedWriteLeavesTargetAndNoTemporaryFile) {
  const std::string before = "# keep\na=1\n";
  WriteFile(P("k"), before);
  const std::string path = P("k");
  const std::string big(4096, 'v');
  pid_t pid = fork();
  ASSERT_GE(pid, 0);
  if (pid == 0) {
    signal(SIGXFSZ, SIG_IGN);
    struct rlimit lim = {64, 64};
    setrlimit(RLIMIT_FSIZE, &lim);
    const int rc = VLIBCFileSetKeyValue(path.c_str(), "a", big.c_str(), "%s=%s\n");
    _exit(rc == -1 && VLIBCErrGet() == VLIBC_ERR_TOO_LONG ? 0 : 1);
  }
  int status = 0;
  ASSERT_EQ(waitpid(pid, &status, 0), pid);
  ASSERT_TRUE(WIFEXITED(status));
  EXPECT_EQ(WEXITSTATUS(status), 0);
  EXPECT_EQ(ReadFile(path), before);
  EXPECT_EQ(ListDir(dir_.path()), std::vector<std::string>{"k"});
}

TEST_F(FileTest, UnreadableTargetIsAnError) {
  mkdir(P("adir").c_str(), 0755);
  EXPECT_EQ(VLIBCFileSetKeyValue(P("adir").c_str(), "a", "1", "%s=%s\n"), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_IO);
  EXPECT_EQ(VLIBCFileRemoveKey(P("adir").c_str(), "a"), -1);
  EXPECT_EQ(VLIBCFileAddLine(P("adir").c_str(), 0, "x", 1), 0);
  EXPECT_EQ(VLIBCFileRemoveLine(P("adir").c_str(), "x"), -1);
  EXPECT_EQ(VLIBCFileUTF8BomStrip(P("adir").c_str()), -1);
  EXPECT_EQ(ListDir(dir_.path()), std::vector<std::string>{"adir"});
  EXPECT_EQ(ListDir(P("adir")), std::vector<std::string>{});
}

TEST_F(FileTest, RemoveKey) {
  WriteFile(P("k"), "# c\nenable_bak=1\nBRIDGE=br0\n  enable_bak=\"2\"\nother=x\n");
  EXPECT_EQ(VLIBCFileRemoveKey(P("k").c_str(), "enable_bak"), 0);
  EXPECT_EQ(ReadFile(P("k")), "# c\nBRIDGE=br0\nother=x\n");
  EXPECT_EQ(VLIBCFileRemoveKey(P("k").c_str(), "absent"), 0);
  EXPECT_EQ(ReadFile(P("k")), "# c\nBRIDGE=br0\nother=x\n");
  EXPECT_EQ(VLIBCFileRemoveKey(P("none").c_str(), "a"), 0);
  EXPECT_FALSE(Exists(P("none")));
  EXPECT_EQ(VLIBCFileRemoveKey(nullptr, "a"), -1);
  EXPECT_EQ(VLIBCFileRemoveKey(P("k").c_str(), ""), -1);
  EXPECT_EQ(ListDir(dir_.path()), std::vector<std::string>{"k"});
}

TEST_F(FileTest, CheckKeyValue) {
  WriteFile(P("vorninfo.conf"), "dns_mode=\"auto\"\nx=manual\nempty=\n");
  const std::string p = P("vorninfo.conf");
  EXPECT_EQ(VLIBCFileCheckKeyValue(p.c_str(), "dns_mode", "auto", 1), 1);
  EXPECT_EQ(VLIBCFileCheckKeyValue(p.c_str(), "dns_mode", "manual", 1), 0);
  EXPECT_EQ(VLIBCFileCheckKeyValue(p.c_str(), "x", "manual", 1), 1);
  EXPECT_EQ(VLIBCFileCheckKeyValue(p.c_str(), "empty", "", 1), 1);
  EXPECT_EQ(VLIBCFileCheckKeyValue(p.c_str(), "absent", "", 1), 0);
  EXPECT_EQ(VLIBCFileCheckKeyValue(P("none").c_str(), "dns_mode", "auto", 1), 0);
  EXPECT_EQ(VLIBCFileCheckKeyValue(p.c_str(), "dns_mode", nullptr, 1), 0);
  EXPECT_EQ(VLIBCFileCheckKeyValue(nullptr, "dns_mode", "auto", 1), 0);
}

TEST_F(FileTest, INFOSetKeyValueWritesTheInfoFile) {
  ASSERT_TRUE(vorntest::InSandbox()) << "writes " VLIBC_INFO_FILE "; sandbox only";
  EXPECT_EQ(VLIBCINFOSetKeyValue("country_code", "US"), 0);
  EXPECT_EQ(VLIBCINFOSetKeyValue("has_wifi_dongle", "yes"), 0);
  EXPECT_EQ(VLIBCINFOSetKeyValue("country_code", "DE"), 0);
  const std::string text = ReadFile(VLIBC_INFO_FILE);
  EXPECT_NE(text.find("country_code=\"DE\"\n"), std::string::npos) << text;
  EXPECT_NE(text.find("has_wifi_dongle=\"yes\"\n"), std::string::npos) << text;
  EXPECT_EQ(text.find("\"US\""), std::string::npos);
  EXPECT_EQ(GetKey(VLIBC_INFO_FILE, "country_code"), "DE");
  EXPECT_LT(VLIBCINFOSetKeyValue("", "x"), 0);
  EXPECT_LT(VLIBCINFOSetKeyValue("k", nullptr), 0);
}

// ---------------------------------------------------------------------------------------------
// GetKeys / SetKeys

TEST_F(FileTest, GetKeysInFileOrder) {
  WriteFile(P("k"), "# comment\nb=2\na=\"1\"\ngarbage\n\n  c=3\nb=dup\n");
  PVLIBSZHASH h = nullptr;
  EXPECT_EQ(VLIBCFileGetKeys(P("k").c_str(), 0, &h, "="), 3);
  ASSERT_NE(h, nullptr);
  EXPECT_EQ(Pairs(h), (KV{{"b", "2"}, {"a", "1"}, {"c", "3"}}));
  // The hash is emptied first.
  WriteFile(P("k2"), "z:26\n");
  EXPECT_EQ(VLIBCFileGetKeys(P("k2").c_str(), 0, &h, ":"), 1);
  EXPECT_EQ(Pairs(h), (KV{{"z", "26"}}));
  WriteFile(P("empty"), "");
  EXPECT_EQ(VLIBCFileGetKeys(P("empty").c_str(), 0, &h, "="), 0);
  EXPECT_EQ(VLIBCSzHashCount(h), 0);
  EXPECT_EQ(VLIBCFileGetKeys(P("none").c_str(), 0, &h, "="), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_NOT_FOUND);
  EXPECT_EQ(VLIBCFileGetKeys(nullptr, 0, &h, "="), -1);
  EXPECT_EQ(VLIBCFileGetKeys(P("k").c_str(), 0, nullptr, "="), -1);
  VLIBCSzHashFree(h);
}

TEST_F(FileTest, SetKeysRewritesOnceKeepingOtherLines) {
  WriteFile(P("k"), "# head\nb=old\nkeep=1\nnot a key\n");
  PVLIBSZHASH set = MakeHash({{"a", "1"}, {"b", "2"}, {"c", "with space"}});
  PVLIBSZHASH other = VLIBCSzHashAlloc(4);
  EXPECT_EQ(VLIBCFileSetKeys(P("k").c_str(), set, other, 0), 3);
  EXPECT_EQ(ReadFile(P("k")), "# head\nb=2\nkeep=1\nnot a key\na=1\nc=with space\n");
  EXPECT_EQ(VLIBCFileSetKeys(P("k").c_str(), set, nullptr, 0), 3);
  EXPECT_EQ(ReadFile(P("k")), "# head\nb=2\nkeep=1\nnot a key\na=1\nc=with space\n");
  VLIBCSzHashSetValue(other, "keep", "");
  EXPECT_EQ(VLIBCFileSetKeys(P("k").c_str(), set, other, 0), 3);
  EXPECT_EQ(ReadFile(P("k")), "# head\nb=2\nnot a key\na=1\nc=with space\n");
  EXPECT_EQ(ListDir(dir_.path()), std::vector<std::string>{"k"});
  VLIBCSzHashFree(set);
  VLIBCSzHashFree(other);
}

// The way the product writes a flat file: unlink, touch, SetKeys; then it reads it back.
TEST_F(FileTest, SetKeysThenGetKeysRoundTrip) {
  const std::string p = P("flat.conf");
  WriteFile(p, "stale=1\n");
  unlink(p.c_str());
  ASSERT_EQ(VLIBCFileTouch(p.c_str()), 0);
  PVLIBSZHASH set = MakeHash({{"z", "last"}, {"a", "first"}, {"q", "\"x\""}});
  PVLIBSZHASH other = VLIBCSzHashAlloc(4);
  EXPECT_EQ(VLIBCFileSetKeys(p.c_str(), set, other, 0), 3);
  PVLIBSZHASH got = nullptr;
  EXPECT_EQ(VLIBCFileGetKeys(p.c_str(), 0, &got, "="), 3);
  EXPECT_EQ(Pairs(got), (KV{{"z", "last"}, {"a", "first"}, {"q", "x"}}));
  VLIBCSzHashFree(set);
  VLIBCSzHashFree(other);
  VLIBCSzHashFree(got);
}

TEST_F(FileTest, SetKeysRefusesBadHashesWithoutWriting) {
  WriteFile(P("k"), "a=1\n");
  PVLIBSZHASH bad = MakeHash({{"ok", "1"}, {std::string(VLIBC_KEY_MAX + 1, 'k'), "v"}});
  EXPECT_EQ(VLIBCFileSetKeys(P("k").c_str(), bad, nullptr, 0), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_TOO_LONG);
  PVLIBSZHASH bad2 = MakeHash({{"ok", "1"}, {"v", std::string(VLIBC_VALUE_MAX + 1, 'v')}});
  EXPECT_EQ(VLIBCFileSetKeys(P("k").c_str(), bad2, nullptr, 0), -1);
  PVLIBSZHASH bad3 = MakeHash({{"x=y", "1"}});
  EXPECT_EQ(VLIBCFileSetKeys(P("k").c_str(), bad3, nullptr, 0), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_BAD_PARAMETER);
  EXPECT_EQ(VLIBCFileSetKeys(P("k").c_str(), nullptr, nullptr, 0), -1);
  EXPECT_EQ(VLIBCFileSetKeys(nullptr, bad, nullptr, 0), -1);
  EXPECT_EQ(ReadFile(P("k")), "a=1\n");
  VLIBCSzHashFree(bad);
  VLIBCSzHashFree(bad2);
  VLIBCSzHashFree(bad3);
}

// ---------------------------------------------------------------------------------------------
// Sections

const char kSectionFile[] =
    "global=1\n"
    "# adapters\n"
    "[conf]\n"
    "\twan=eth0\n"
    "\tmode=\"dhcp\"\n"
    "# inside conf\n"
    "\tgarbage here\n"
    "\n"
    "[addr]\n"
    "ip=10.0.0.1\n"
    "  mask = 255.0.0.0\n"
    "[lan]\n"
    "[ spaced ]\n"
    "k=v\n";

TEST_F(FileTest, EnumSectionInFileOrder) {
  WriteFile(P("s"), kSectionFile);
  PVLIBSZLIST l = nullptr;
  EXPECT_EQ(VLIBCFileEnumSection(P("s").c_str(), &l), 4);
  EXPECT_EQ(Items(l), (std::vector<std::string>{"conf", "addr", "lan", "spaced"}));
  WriteFile(P("plain"), "a=1\n");
  EXPECT_EQ(VLIBCFileEnumSection(P("plain").c_str(), &l), 0);
  EXPECT_EQ(Items(l), std::vector<std::string>{});
  EXPECT_EQ(VLIBCFileEnumSection(P("none").c_str(), &l), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_NOT_FOUND);
  EXPECT_EQ(VLIBCFileEnumSection(nullptr, &l), -1);
  EXPECT_EQ(VLIBCFileEnumSection(P("s").c_str(), nullptr), -1);
  VLIBCSzListFree(l);
}

TEST_F(FileTest, GetSectionKeysOfOneSection) {
  WriteFile(P("s"), kSectionFile);
  PVLIBSZHASH h = VLIBCSzHashAlloc(1024);
  EXPECT_EQ(VLIBCFileGetSection(P("s").c_str(), "conf", &h), 2);
  EXPECT_EQ(Pairs(h), (KV{{"wan", "eth0"}, {"mode", "dhcp"}}));
  EXPECT_EQ(VLIBCFileGetSection(P("s").c_str(), "addr", &h), 2);
  EXPECT_EQ(Pairs(h), (KV{{"ip", "10.0.0.1"}, {"mask", "255.0.0.0"}}));
  EXPECT_EQ(VLIBCFileGetSection(P("s").c_str(), "lan", &h), 0);
  EXPECT_EQ(VLIBCSzHashCount(h), 0);
  EXPECT_EQ(VLIBCFileGetSection(P("s").c_str(), "spaced", &h), 1);
  EXPECT_EQ(VLIBCFileGetSection(P("s").c_str(), "absent", &h), 0);
  EXPECT_EQ(VLIBCFileGetSection(P("none").c_str(), "conf", &h), -1);
  mkdir(P("adir").c_str(), 0755);
  EXPECT_EQ(VLIBCFileGetSection(P("adir").c_str(), "conf", &h), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_IO);
  EXPECT_EQ(VLIBCFileGetSection(P("s").c_str(), nullptr, &h), -1);
  EXPECT_EQ(VLIBCFileGetSection(P("s").c_str(), "conf", nullptr), -1);
  VLIBCSzHashFree(h);
}

TEST_F(FileTest, AddSectionRoundTripsEveryFormat) {
  const std::string p = P("profile");
  PVLIBSZHASH h = MakeHash({{"apn", "internet"}, {"user", "a b"}});
  EXPECT_EQ(VLIBCFileAddSection(p.c_str(), "profile1", h, "%s=%s\n"), 1);
  EXPECT_EQ(VLIBCFileAddSection(p.c_str(), "wlan0", h, "\t%s=%s\n"), 1);
  EXPECT_EQ(VLIBCFileAddSection(p.c_str(), "quoted", h, "%s=\"%s\"\n"), 1);
  EXPECT_EQ(ReadFile(p),
            "[profile1]\napn=internet\nuser=a b\n"
            "[wlan0]\n\tapn=internet\n\tuser=a b\n"
            "[quoted]\napn=\"internet\"\nuser=\"a b\"\n");
  PVLIBSZHASH got = nullptr;
  for (const char* s : {"profile1", "wlan0", "quoted"}) {
    EXPECT_EQ(VLIBCFileGetSection(p.c_str(), s, &got), 2) << s;
    EXPECT_EQ(Pairs(got), (KV{{"apn", "internet"}, {"user", "a b"}})) << s;
  }
  PVLIBSZHASH empty = VLIBCSzHashAlloc(1);
  EXPECT_EQ(VLIBCFileAddSection(p.c_str(), "lan", empty, "\t%s=%s\n"), 1);
  EXPECT_EQ(VLIBCFileGetSection(p.c_str(), "lan", &got), 0);
  EXPECT_EQ(ListDir(dir_.path()), std::vector<std::string>{"profile"});
  VLIBCSzHashFree(h);
  VLIBCSzHashFree(got);
  VLIBCSzHashFree(empty);
}

TEST_F(FileTest, AddSectionAfterTextWithoutFinalNewline) {
  WriteFile(P("s"), "# head");
  PVLIBSZHASH h = MakeHash({{"k", "v"}});
  EXPECT_EQ(VLIBCFileAddSection(P("s").c_str(), "x", h, "\t%s=%s\n"), 1);
  EXPECT_EQ(ReadFile(P("s")), "# head\n[x]\n\tk=v\n");
  VLIBCSzHashFree(h);
}

TEST_F(FileTest, AddSectionRefusesBadInputWithoutWriting) {
  WriteFile(P("s"), kSectionFile);
  PVLIBSZHASH h = MakeHash({{"k", "v"}});
  PVLIBSZHASH longValue = MakeHash({{"k", std::string(VLIBC_VALUE_MAX + 1, 'v')}});
  EXPECT_EQ(VLIBCFileAddSection(P("s").c_str(), "x", longValue, "\t%s=%s\n"), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_TOO_LONG);
  EXPECT_EQ(VLIBCFileAddSection(P("s").c_str(), std::string(VLIBC_KEY_MAX + 1, 's').c_str(), h,
                                "\t%s=%s\n"),
            -1);
  for (const char* name : {"", "a]b", "[a", "a\nb", static_cast<const char*>(nullptr)}) {
    EXPECT_EQ(VLIBCFileAddSection(P("s").c_str(), name, h, "\t%s=%s\n"), -1);
  }
  EXPECT_EQ(VLIBCFileAddSection(P("s").c_str(), "x", h, "\t%s\n"), -1);
  EXPECT_EQ(VLIBCFileAddSection(P("s").c_str(), "x", nullptr, "\t%s=%s\n"), -1);
  EXPECT_EQ(VLIBCFileAddSection(nullptr, "x", h, "\t%s=%s\n"), -1);
  EXPECT_EQ(ReadFile(P("s")), kSectionFile);
  EXPECT_EQ(VLIBCFileAddSection(P("nodir/s").c_str(), "x", h, "\t%s=%s\n"), -1);
  VLIBCSzHashFree(h);
  VLIBCSzHashFree(longValue);
}

TEST_F(FileTest, SetSectionReplacesKeysAndKeepsTheRest) {
  WriteFile(P("s"), kSectionFile);
  PVLIBSZHASH h = MakeHash({{"mode", "static"}, {"ip", "192.168.1.2"}});
  EXPECT_EQ(VLIBCFileSetSection(P("s").c_str(), "conf", h, "\t%s=%s\n"), 1);
  EXPECT_EQ(ReadFile(P("s")),
            "global=1\n"
            "# adapters\n"
            "[conf]\n"
            "\tmode=static\n"
            "\tip=192.168.1.2\n"
            "# inside conf\n"
            "\tgarbage here\n"
            "\n"
            "[addr]\n"
            "ip=10.0.0.1\n"
            "  mask = 255.0.0.0\n"
            "[lan]\n"
            "[ spaced ]\n"
            "k=v\n");
  PVLIBSZHASH got = nullptr;
  EXPECT_EQ(VLIBCFileGetSection(P("s").c_str(), "conf", &got), 2);
  EXPECT_EQ(Pairs(got), (KV{{"mode", "static"}, {"ip", "192.168.1.2"}}));
  // An empty section gets its keys right after the header; the default format is tabbed.
  EXPECT_EQ(VLIBCFileSetSection(P("s").c_str(), "lan", h), 1);
  EXPECT_EQ(VLIBCFileGetSection(P("s").c_str(), "lan", &got), 2);
  EXPECT_NE(ReadFile(P("s")).find("[lan]\n\tmode=static\n\tip=192.168.1.2\n[ spaced ]\n"),
            std::string::npos);
  // An absent section is appended.
  EXPECT_EQ(VLIBCFileSetSection(P("s").c_str(), "new", h, "%s=%s\n"), 1);
  EXPECT_EQ(VLIBCFileGetSection(P("s").c_str(), "new", &got), 2);
  EXPECT_EQ(VLIBCFileGetSection(P("s").c_str(), "addr", &got), 2);
  EXPECT_EQ(Pairs(got), (KV{{"ip", "10.0.0.1"}, {"mask", "255.0.0.0"}}));
  EXPECT_EQ(ListDir(dir_.path()), std::vector<std::string>{"s"});
  VLIBCSzHashFree(h);
  VLIBCSzHashFree(got);
}

TEST_F(FileTest, SetSectionMakesMissingFileAndRefusesBadInput) {
  PVLIBSZHASH h = MakeHash({{"k", "v"}});
  EXPECT_EQ(VLIBCFileSetSection(P("s").c_str(), "x", h), 1);
  EXPECT_EQ(ReadFile(P("s")), "[x]\n\tk=v\n");
  PVLIBSZHASH bad = MakeHash({{"k", std::string(VLIBC_VALUE_MAX + 1, 'v')}});
  EXPECT_EQ(VLIBCFileSetSection(P("s").c_str(), "x", bad), -1);
  EXPECT_EQ(VLIBCFileSetSection(P("s").c_str(), "x", h, "%d"), -1);
  EXPECT_EQ(VLIBCFileSetSection(P("s").c_str(), "x", nullptr), -1);
  EXPECT_EQ(VLIBCFileSetSection(P("s").c_str(), "", h), -1);
  EXPECT_EQ(ReadFile(P("s")), "[x]\n\tk=v\n");
  VLIBCSzHashFree(h);
  VLIBCSzHashFree(bad);
}

TEST_F(FileTest, RemoveSection) {
  WriteFile(P("s"), kSectionFile);
  EXPECT_EQ(VLIBCFileRemoveSection(P("s").c_str(), "conf"), 0);
  EXPECT_EQ(
      ReadFile(P("s")),
      "global=1\n# adapters\n[addr]\nip=10.0.0.1\n  mask = 255.0.0.0\n[lan]\n[ spaced ]\nk=v\n");
  EXPECT_EQ(VLIBCFileRemoveSection(P("s").c_str(), "spaced"), 0);
  EXPECT_EQ(ReadFile(P("s")),
            "global=1\n# adapters\n[addr]\nip=10.0.0.1\n  mask = 255.0.0.0\n[lan]\n");
  EXPECT_EQ(VLIBCFileRemoveSection(P("s").c_str(), "absent"), 0);
  EXPECT_EQ(VLIBCFileRemoveSection(P("none").c_str(), "conf"), 0);
  EXPECT_FALSE(Exists(P("none")));
  EXPECT_EQ(VLIBCFileRemoveSection(nullptr, "conf"), -1);
  EXPECT_EQ(VLIBCFileRemoveSection(P("s").c_str(), ""), -1);
}

TEST_F(FileTest, SectionValueGetAndSetKeepTheLineForm) {
  WriteFile(P("s"), kSectionFile);
  const std::string p = P("s");
  char buf[1024];
  EXPECT_EQ(VLIBCFileGetSectionValue(p.c_str(), "conf", "mode", buf, 1024), 4);
  EXPECT_STREQ(buf, "dhcp");
  EXPECT_EQ(VLIBCFileGetSectionValue(p.c_str(), "addr", "mask", buf, 1024), 9);
  EXPECT_EQ(VLIBCFileGetSectionValue(p.c_str(), "addr", "wan", buf, 1024), 0);
  EXPECT_EQ(VLIBCFileGetSectionValue(p.c_str(), "absent", "wan", buf, 1024), 0);
  EXPECT_EQ(VLIBCFileGetSectionValue(p.c_str(), "conf", "wan", buf, 3), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_TOO_LONG);
  EXPECT_EQ(VLIBCFileGetSectionValue(P("none").c_str(), "conf", "wan", buf, 1024), -1);
  EXPECT_EQ(VLIBCFileGetSectionValue(p.c_str(), "conf", nullptr, buf, 1024), -1);

  EXPECT_EQ(VLIBCFileSetSectionValue(p.c_str(), "conf", "mode", "static"), 0);    // quoted, tab
  EXPECT_EQ(VLIBCFileSetSectionValue(p.c_str(), "conf", "gw", "10.0.0.254"), 0);  // new, tab
  EXPECT_EQ(VLIBCFileSetSectionValue(p.c_str(), "addr", "ip", "10.0.0.2"), 0);    // plain
  EXPECT_EQ(VLIBCFileSetSectionValue(p.c_str(), "lan", "dhcp", "on"), 0);         // empty
  EXPECT_EQ(VLIBCFileSetSectionValue(p.c_str(), "extra", "a", "b"), 0);           // absent
  EXPECT_EQ(ReadFile(p),
            "global=1\n"
            "# adapters\n"
            "[conf]\n"
            "\twan=eth0\n"
            "\tmode=\"static\"\n"
            "\tgw=10.0.0.254\n"
            "# inside conf\n"
            "\tgarbage here\n"
            "\n"
            "[addr]\n"
            "ip=10.0.0.2\n"
            "  mask = 255.0.0.0\n"
            "[lan]\n"
            "dhcp=on\n"
            "[ spaced ]\n"
            "k=v\n"
            "[extra]\n"
            "a=b\n");
  EXPECT_EQ(VLIBCFileGetSectionValue(p.c_str(), "conf", "mode", buf, 1024), 6);
  EXPECT_STREQ(buf, "static");
  EXPECT_EQ(ListDir(dir_.path()), std::vector<std::string>{"s"});
}

TEST_F(FileTest, SetSectionValueMakesFileAndRefusesBadInput) {
  const std::string p = P("profile");
  EXPECT_EQ(VLIBCFileSetSectionValue(p.c_str(), "profile", "apn", "internet"), 0);
  EXPECT_EQ(ReadFile(p), "[profile]\napn=internet\n");
  const std::string longValue(VLIBC_VALUE_MAX + 1, 'v');
  EXPECT_EQ(VLIBCFileSetSectionValue(p.c_str(), "profile", "apn", longValue.c_str()), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_TOO_LONG);
  EXPECT_EQ(VLIBCFileSetSectionValue(p.c_str(), "profile", std::string(300, 'k').c_str(), "v"), -1);
  EXPECT_EQ(VLIBCFileSetSectionValue(p.c_str(), "", "apn", "v"), -1);
  EXPECT_EQ(VLIBCFileSetSectionValue(p.c_str(), "profile", "apn", nullptr), -1);
  EXPECT_EQ(VLIBCFileSetSectionValue(nullptr, "profile", "apn", "v"), -1);
  EXPECT_EQ(ReadFile(p), "[profile]\napn=internet\n");
}

TEST_F(FileTest, Hash2FileWritesOneSection) {
  const std::string p = P("out");
  FILE* fp = std::fopen(p.c_str(), "w");
  ASSERT_NE(fp, nullptr);
  PVLIBSZHASH h = MakeHash({{"ssid", "home"}, {"gone", "x"}, {"key", "a b"}});
  VLIBCSzHashRemoveKey(h, "gone");
  EXPECT_EQ(VLIBCFileHash2File(fp, "wlan0", h, "\t%s=%s\n"), 0);
  EXPECT_EQ(VLIBCHashRemoveAll(h), 0);
  VLIBCSzHashSetValue(h, "x", "1");
  EXPECT_EQ(VLIBCFileHash2File(fp, "wlan1", h, "\t%s=%s\n"), 0);
  EXPECT_EQ(VLIBCFileHash2File(fp, "bad", h, "%s"), -1);
  EXPECT_EQ(VLIBCFileHash2File(fp, "", h, "\t%s=%s\n"), -1);
  EXPECT_EQ(VLIBCFileHash2File(fp, "bad", nullptr, "\t%s=%s\n"), -1);
  EXPECT_EQ(VLIBCFileHash2File(nullptr, "bad", h, "\t%s=%s\n"), -1);
  std::fclose(fp);
  EXPECT_EQ(ReadFile(p), "[wlan0]\n\tssid=home\n\tkey=a b\n[wlan1]\n\tx=1\n");
  PVLIBSZLIST l = nullptr;
  EXPECT_EQ(VLIBCFileEnumSection(p.c_str(), &l), 2);
  PVLIBSZHASH got = nullptr;
  EXPECT_EQ(VLIBCFileGetSection(p.c_str(), "wlan0", &got), 2);
  EXPECT_EQ(Pairs(got), (KV{{"ssid", "home"}, {"key", "a b"}}));
  VLIBCSzListFree(l);
  VLIBCSzHashFree(h);
  VLIBCSzHashFree(got);
}

TEST_F(FileTest, Hash2FileReportsAWriteError) {
  FILE* fp = std::fopen("/dev/full", "w");
  ASSERT_NE(nullptr, fp) << "no /dev/full";
  setvbuf(fp, nullptr, _IONBF, 0);
  PVLIBSZHASH h = MakeHash({{"k", "v"}});
  EXPECT_EQ(VLIBCFileHash2File(fp, "x", h, "\t%s=%s\n"), -1);
  EXPECT_NE(VLIBCErrGet(), 0);
  std::fclose(fp);
  VLIBCSzHashFree(h);
}

// ---------------------------------------------------------------------------------------------
// Lines, BOM, copy

TEST_F(FileTest, AddLineOnlyWhenAbsent) {
  const std::string p = P("wvdial");
  WriteFile(p, "noauth\n  usepeerdns  \n");
  EXPECT_EQ(VLIBCFileAddLine(p.c_str(), 0, "nodefaultroute", 1), 1);
  EXPECT_EQ(VLIBCFileAddLine(p.c_str(), 0, "nodefaultroute", 1), 1);
  EXPECT_EQ(VLIBCFileAddLine(p.c_str(), 0, "usepeerdns", 1), 1);
  EXPECT_EQ(ReadFile(p), "noauth\n  usepeerdns  \nnodefaultroute\n");
  EXPECT_EQ(VLIBCFileAddLine(p.c_str(), 0, "noauth", 0), 1);  // not unique: always appended
  EXPECT_EQ(ReadFile(p), "noauth\n  usepeerdns  \nnodefaultroute\nnoauth\n");
  WriteFile(P("nonl"), "a");
  EXPECT_EQ(VLIBCFileAddLine(P("nonl").c_str(), 0, "b", 1), 1);
  EXPECT_EQ(ReadFile(P("nonl")), "a\nb\n");
  EXPECT_EQ(VLIBCFileAddLine(P("made").c_str(), 0, "x", 1), 1);
  EXPECT_EQ(ReadFile(P("made")), "x\n");
  EXPECT_EQ(VLIBCFileAddLine(p.c_str(), 0, nullptr, 1), 0);
  EXPECT_EQ(VLIBCFileAddLine(p.c_str(), 0, "a\nb", 1), 0);
  EXPECT_EQ(VLIBCFileAddLine(nullptr, 0, "a", 1), 0);
  EXPECT_EQ(VLIBCFileAddLine(P("nodir/x").c_str(), 0, "a", 1), 0);
}

TEST_F(FileTest, RemoveLineDropsEveryEqualLine) {
  const std::string p = P("wvdial");
  WriteFile(p, "noauth\nnodefaultroute\n  nodefaultroute \n# nodefaultroute\nx\n");
  EXPECT_EQ(VLIBCFileRemoveLine(p.c_str(), "nodefaultroute"), 0);
  EXPECT_EQ(ReadFile(p), "noauth\n# nodefaultroute\nx\n");
  EXPECT_EQ(VLIBCFileRemoveLine(p.c_str(), "nodefaultroute"), 0);
  EXPECT_EQ(ReadFile(p), "noauth\n# nodefaultroute\nx\n");
  EXPECT_EQ(VLIBCFileRemoveLine(P("none").c_str(), "x"), 0);
  EXPECT_FALSE(Exists(P("none")));
  EXPECT_EQ(VLIBCFileRemoveLine(p.c_str(), nullptr), -1);
  EXPECT_EQ(VLIBCFileRemoveLine("", "x"), -1);
  EXPECT_EQ(ListDir(dir_.path()), std::vector<std::string>{"wvdial"});
}

TEST_F(FileTest, BomStrip) {
  const std::string p = P("cfg");
  WriteFile(p, "\xEF\xBB\xBFpassword=x\n\xEF\xBB\xBF", 0600);
  EXPECT_EQ(VLIBCFileUTF8BomStrip(p.c_str()), 0);
  EXPECT_EQ(ReadFile(p), "password=x\n\xEF\xBB\xBF");
  EXPECT_EQ(FileMode(p), 0600);
  EXPECT_EQ(VLIBCFileUTF8BomStrip(p.c_str()), 0);
  EXPECT_EQ(ReadFile(p), "password=x\n\xEF\xBB\xBF");
  WriteFile(P("short"), "\xEF\xBB");
  EXPECT_EQ(VLIBCFileUTF8BomStrip(P("short").c_str()), 0);
  EXPECT_EQ(ReadFile(P("short")), "\xEF\xBB");
  WriteFile(P("only"), "\xEF\xBB\xBF");
  EXPECT_EQ(VLIBCFileUTF8BomStrip(P("only").c_str()), 0);
  EXPECT_EQ(ReadFile(P("only")), "");
  EXPECT_EQ(VLIBCFileUTF8BomStrip(P("none").c_str()), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_NOT_FOUND);
  EXPECT_EQ(VLIBCFileUTF8BomStrip(nullptr), -1);
}

TEST_F(FileTest, FileCopy) {
  const std::string src = P("src");
  const std::string bin("a\0b\xff\n", 5);
  WriteFile(src, bin, 0640);
  EXPECT_EQ(VORNFileCopy(src.c_str(), P("dst").c_str(), 0, 0), 0);
  EXPECT_EQ(ReadFile(P("dst")), bin);
  EXPECT_EQ(FileMode(P("dst")), 0640);
  WriteFile(P("old"), "old content", 0600);
  EXPECT_EQ(VORNFileCopy(src.c_str(), P("old").c_str(), 0, 0), 0);
  EXPECT_EQ(ReadFile(P("old")), bin);
  EXPECT_EQ(FileMode(P("old")), 0640);
  EXPECT_EQ(VORNFileCopy(src.c_str(), P("m").c_str(), 0, 0600), 0);
  EXPECT_EQ(FileMode(P("m")), 0600);
  EXPECT_EQ(ListDir(dir_.path()), (std::vector<std::string>{"dst", "m", "old", "src"}));
}

TEST_F(FileTest, FileCopyFailures) {
  WriteFile(P("src"), "data");
  WriteFile(P("dst"), "keep");
  EXPECT_NE(VORNFileCopy(P("none").c_str(), P("dst").c_str(), 0, 0), 0);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_NOT_FOUND);
  EXPECT_EQ(ReadFile(P("dst")), "keep");
  mkdir(P("adir").c_str(), 0755);
  EXPECT_NE(VORNFileCopy(P("adir").c_str(), P("dst").c_str(), 0, 0), 0);
  EXPECT_NE(VORNFileCopy(P("src").c_str(), P("nodir/dst").c_str(), 0, 0), 0);
  EXPECT_NE(VORNFileCopy(nullptr, P("dst").c_str(), 0, 0), 0);
  EXPECT_NE(VORNFileCopy(P("src").c_str(), "", 0, 0), 0);
  // The rename itself fails (a non-empty directory is in the way): nothing is left behind.
  WriteFile(P("adir/inside"), "x");
  EXPECT_NE(VORNFileCopy(P("src").c_str(), P("adir").c_str(), 0, 0), 0);
  EXPECT_NE(VLIBCErrGet(), 0);
  EXPECT_EQ(ListDir(dir_.path()), (std::vector<std::string>{"adir", "dst", "src"}));
  EXPECT_EQ(ListDir(P("adir")), std::vector<std::string>{"inside"});
  EXPECT_EQ(ReadFile(P("dst")), "keep");
}

}  // namespace
