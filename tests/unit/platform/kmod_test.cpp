#include "vornplatform/kmod.h"

#include <dirent.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/utsname.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>
#include <string>

#include "support/test_util.h"
#include "vornplatform/err.h"

namespace {

using vorntest::ReadFile;
using vorntest::WriteFile;

// Some module sysfs knows about (loaded or built in), "" when there is none.
std::string AnyPresentModule() {
  DIR* d = opendir("/sys/module");
  if (d == nullptr) return "";
  std::string found;
  while (const struct dirent* de = readdir(d)) {
    if (de->d_name[0] != '.') {
      found = de->d_name;
      break;
    }
  }
  closedir(d);
  return found;
}

PVLIBSZLIST ListOf(std::initializer_list<const char*> items) {
  PVLIBSZLIST l = VLIBCSzListAlloc(4);
  for (const char* i : items) VLIBCSzListPush(&l, i);
  return l;
}

TEST(KmodTest, CheckModuleLooksAtSysModule) {
  const std::string present = AnyPresentModule();
  ASSERT_FALSE(present.empty()) << "no /sys/module here";
  EXPECT_EQ(VORNCheckModule(present.c_str()), 1);
  std::string dashed = present;
  for (char& c : dashed) {
    if (c == '_') c = '-';
  }
  EXPECT_EQ(VORNCheckModule(dashed.c_str()), 1);
  EXPECT_EQ(VORNCheckModule("vorn_no_such_module"), 0);
}

TEST(KmodTest, CheckModuleRefusesBadNames) {
  VLIBCErrClear();
  EXPECT_EQ(VORNCheckModule(nullptr), 0);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_BAD_PARAMETER);
  EXPECT_EQ(VORNCheckModule(""), 0);
  EXPECT_EQ(VORNCheckModule(".."), 0);
  EXPECT_EQ(VORNCheckModule("../module"), 0);
}

TEST(KmodTest, InsertOfPresentModuleIsSuccess) {
  const std::string present = AnyPresentModule();
  ASSERT_FALSE(present.empty()) << "no /sys/module here";
  PVLIBSZLIST l = ListOf({(present + ".ko").c_str(), present.c_str()});
  EXPECT_EQ(VLIBIptablesModInsert("usbmodem_service", l), 0);
  VLIBCSzListFree(l);
  PVLIBSZLIST empty = VLIBCSzListAlloc(1);
  EXPECT_EQ(VLIBIptablesModInsert("usbmodem_service", empty), 0);
  VLIBCSzListFree(empty);
}

TEST(KmodTest, InsertFailures) {
  VLIBCErrClear();
  EXPECT_EQ(VLIBIptablesModInsert("usbmodem_service", nullptr), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_BAD_PARAMETER);
  PVLIBSZLIST bad = ListOf({"../../evil.ko"});
  EXPECT_EQ(VLIBIptablesModInsert("usbmodem_service", bad), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_BAD_PARAMETER);
  VLIBCSzListFree(bad);
  PVLIBSZLIST missing = ListOf({"vorn_no_such_module.ko"});
  VLIBCErrClear();
  EXPECT_EQ(VLIBIptablesModInsert("usbmodem_service", missing), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_NOT_FOUND);
  VLIBCSzListFree(missing);
}

// Inside the sandbox /lib/modules and /sbin lie on the /usr overlay: a modules.dep of our own
// and a recording modprobe stand in for the kernel's.
class KmodSandboxTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox()) << "replaces /sbin/modprobe; sandbox only";
    struct utsname u;
    ASSERT_EQ(uname(&u), 0);
    modDir_ = std::string("/lib/modules/") + u.release;
    ASSERT_EQ(vorntest::Run({"/bin/mkdir", "-p", modDir_}).status, 0);
    ASSERT_TRUE(WriteFile(modDir_ + "/modules.dep",
                          "kernel/drivers/net/slhc/vorn_fake_dep.ko.xz:\n"
                          "kernel/drivers/net/ppp/vorn_fake_mod.ko.zst: "
                          "kernel/drivers/net/slhc/vorn_fake_dep.ko.xz\n"));
    log_ = dir_ / "modprobe.log";
    setenv("VORN_MODPROBE_LOG", log_.c_str(), 1);
    vorntest::Run({"/bin/mv", "/sbin/modprobe", "/sbin/modprobe.vorn-test-orig"});
    ASSERT_TRUE(WriteFile(
        "/sbin/modprobe",
        "#!/bin/sh\necho \"$@\" >> \"$VORN_MODPROBE_LOG\"\nexit ${VORN_MODPROBE_RC:-0}\n", 0755));
    VLIBCErrClear();
  }
  void TearDown() override {
    if (!vorntest::InSandbox()) return;
    unlink("/sbin/modprobe");
    vorntest::Run({"/bin/mv", "/sbin/modprobe.vorn-test-orig", "/sbin/modprobe"});
    unlink((modDir_ + "/modules.dep").c_str());
    unsetenv("VORN_MODPROBE_LOG");
    unsetenv("VORN_MODPROBE_RC");
  }
  vorntest::TempDir dir_;
  std::string modDir_;
  std::string log_;
};

TEST_F(KmodSandboxTest, ListedModuleIsLoadedWithModprobe) {
  PVLIBSZLIST l = ListOf({"vorn_fake_mod.ko", "vorn-fake-dep"});
  EXPECT_EQ(VLIBIptablesModInsert("usbmodem_service", l), 0);
  EXPECT_EQ(ReadFile(log_), "vorn_fake_mod\nvorn_fake_dep\n");
  VLIBCSzListFree(l);
}

TEST_F(KmodSandboxTest, UnlistedModuleNeverReachesModprobe) {
  PVLIBSZLIST l = ListOf({"vorn_unlisted.ko"});
  EXPECT_EQ(VLIBIptablesModInsert("usbmodem_service", l), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_NOT_FOUND);
  EXPECT_EQ(ReadFile(log_), "");
  VLIBCSzListFree(l);
}

TEST_F(KmodSandboxTest, ModprobeFailureIsAFailureButOthersAreTried) {
  setenv("VORN_MODPROBE_RC", "1", 1);
  PVLIBSZLIST l = ListOf({"vorn_fake_mod.ko", "vorn_fake_dep.ko"});
  EXPECT_EQ(VLIBIptablesModInsert("usbmodem_service", l), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_EXEC);
  EXPECT_EQ(ReadFile(log_), "vorn_fake_mod\nvorn_fake_dep\n");
  VLIBCSzListFree(l);
}

TEST_F(KmodSandboxTest, WithoutModprobeTheFileMustExist) {
  ASSERT_EQ(chmod("/sbin/modprobe", 0644), 0);  // not executable: the direct way is taken
  PVLIBSZLIST l = ListOf({"vorn_fake_mod.ko"});
  EXPECT_EQ(VLIBIptablesModInsert("usbmodem_service", l), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_NOT_FOUND);
  EXPECT_EQ(ReadFile(log_), "");
  VLIBCSzListFree(l);
}

}  // namespace
