// Model detection reads the unit's "unique" key through /bin/get_key_value.
#include "vornwireless/utils/is_sky_model.h"

#include <gtest/gtest.h>

#include "support/syslog_capture.h"
#include "support/test_util.h"

using namespace vornwireless::utils;
using vorntest::LogLine;
using vorntest::SyslogCapture;

class SkyModel : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox()) << "needs the sandbox (/usr overlay)";
  }
  void TearDown() override { vorntest::Run({"/bin/rm", "-f", "/usr/bin/get_key_value", "/run/gkv.args"}); }
  // Installs a stand-in for the appliance tool that prints unique and records its arguments.
  void Install(const std::string& unique) {
    ASSERT_TRUE(vorntest::WriteFile("/usr/bin/get_key_value",
                                    "#!/bin/sh\necho \"$@\" >> /run/gkv.args\nprintf '%s\\n' '" + unique + "'\n",
                                    0755));
  }
};

TEST_F(SkyModel, ThirdPieceDecides) {
  Install("vs_x86_713sky_r2");
  EXPECT_TRUE(IsSkyModel());
  EXPECT_TRUE(Is713SkyModel());
  EXPECT_FALSE(Is715SkyModel());
  EXPECT_EQ("/etc/vorninfo.conf unique\n/etc/vorninfo.conf unique\n/etc/vorninfo.conf unique\n",
            vorntest::ReadFile("/run/gkv.args"));
}

TEST_F(SkyModel, Model715) {
  Install("vs_arm_715sky");
  EXPECT_TRUE(IsSkyModel());
  EXPECT_FALSE(Is713SkyModel());
  EXPECT_TRUE(Is715SkyModel());
}

TEST_F(SkyModel, SkyElsewhereThanTheThirdPieceDoesNotCount) {
  Install("sky_713sky_plain_715sky");
  EXPECT_FALSE(IsSkyModel());
  EXPECT_FALSE(Is713SkyModel());
  EXPECT_FALSE(Is715SkyModel());
}

TEST_F(SkyModel, ShortValuesAreNoSkyModel) {
  Install("vs_x86");
  EXPECT_FALSE(IsSkyModel());
  Install("");
  EXPECT_FALSE(IsSkyModel());
}

TEST_F(SkyModel, MissingToolIsLoggedAndFalse) {
  vorntest::Run({"/bin/rm", "-f", "/usr/bin/get_key_value"});
  SyslogCapture log;
  EXPECT_FALSE(IsSkyModel());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/is_sky_model.cpp", "Failed to run /bin/get_key_value")))
      << log.Dump();
}
