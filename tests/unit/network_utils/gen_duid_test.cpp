// The DUID from eth0's MAC address (a veth in the sandbox).
#include "vornwireless/utils/gen_duid.h"

#include <gtest/gtest.h>

#include "support/syslog_capture.h"
#include "support/test_util.h"

using vornwireless::utils::GenDUID;
using vorntest::LogLine;
using vorntest::SyslogCapture;

namespace {
void Ip(std::vector<std::string> args) {
  args.insert(args.begin(), "/usr/sbin/ip");
  auto r = vorntest::Run(args);
  ASSERT_EQ(r.status, 0) << r.err;
}
}  // namespace

TEST(GenDUID, EscapedDuidLlOfEth0) {
  Ip({"link", "set", "eth0", "address", "02:ab:cd:0e:f1:23"});
  EXPECT_EQ(GenDUID(), "\\x00\\x03\\x00\\x01\\x02\\xAB\\xCD\\x0E\\xF1\\x23");
  EXPECT_EQ(GenDUID().size(), 40u);
}

TEST(GenDUID, MissingEth0GivesEmptyText) {
  Ip({"link", "set", "eth0", "down"});
  Ip({"link", "set", "eth0", "name", "eth0x"});
  SyslogCapture log;
  std::string duid = GenDUID();
  Ip({"link", "set", "eth0x", "name", "eth0"});
  Ip({"link", "set", "eth0", "up"});
  EXPECT_EQ(duid, "");
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/gen_duid.cpp", "Error getting eth0 info")))
      << log.Dump();
}
