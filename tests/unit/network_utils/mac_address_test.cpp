// MAC address values: formal form, formalising, the next address and stream input.
#include "vornwireless/utils/mac_address.h"

#include <gtest/gtest.h>

#include <sstream>

#include "support/syslog_capture.h"

using vornwireless::utils::MacAddress;
using vorntest::LogLine;
using vorntest::SyslogCapture;

namespace {
const char kFile[] = "utils/mac_address.cpp";
}

TEST(MacAddress, TwelveDigitsGetColonsInTheirCase) {
  MacAddress mac(std::string("AAbbCC001122"));
  EXPECT_EQ(mac.ToString(), "AA:bb:CC:00:11:22");
  EXPECT_TRUE(mac.IsFormalized());
  EXPECT_STREQ(mac.ToCString(), "AA:bb:CC:00:11:22");
  EXPECT_EQ(static_cast<std::string>(mac), "AA:bb:CC:00:11:22");
}

TEST(MacAddress, ElevenDigitsStayAsGiven) {
  SyslogCapture log;
  MacAddress mac(std::string("aabbcc00112"));
  EXPECT_EQ(mac.ToString(), "aabbcc00112");
  EXPECT_FALSE(mac.IsFormalized());
  EXPECT_TRUE(log.HasOnce(LOG_DEBUG, LogLine(kFile, "Bad mac addr length (11)"))) << log.Dump();
  EXPECT_EQ(mac.Formalize(), -1);
  EXPECT_EQ(mac.ToString(), "aabbcc00112");
}

TEST(MacAddress, BadCharacterIsLoggedAndKept) {
  SyslogCapture log;
  MacAddress mac;
  mac = std::string("aabbcc0011zz");
  EXPECT_EQ(mac.ToString(), "aabbcc0011zz");
  EXPECT_FALSE(mac.IsFormalizable());
  EXPECT_EQ(log.Matching(LogLine(kFile, "Bad mac addr [aabbcc0011zz]")).size(), 2u) << log.Dump();
}

TEST(MacAddress, FormalTextIsKept) {
  MacAddress mac(std::string("00:11:22:aa:BB:cc"));
  EXPECT_EQ(mac.ToString(), "00:11:22:aa:BB:cc");
  EXPECT_EQ(mac.Formalize(), 0);
  EXPECT_FALSE(MacAddress(std::string("00-11-22-aa-bb-cc")).IsFormalized());
  EXPECT_FALSE(MacAddress(std::string("00:11:22:aa:bb:cg")).IsFormalized());
  EXPECT_TRUE(MacAddress().ToString().empty());
}

TEST(MacAddress, EqualityIsExactText) {
  EXPECT_TRUE(MacAddress(std::string("aabbccddeeff")) == MacAddress(std::string("aa:bb:cc:dd:ee:ff")));
  EXPECT_FALSE(MacAddress(std::string("AABBCCDDEEFF")) == MacAddress(std::string("aabbccddeeff")));
}

TEST(MacAddress, PlusWrapsTheLastOctetModulo255) {
  MacAddress mac(std::string("00:11:22:33:44:FE"));
  EXPECT_EQ((mac + 1).ToString(), "00:11:22:33:44:00");
  EXPECT_EQ((mac + 0).ToString(), "00:11:22:33:44:fe");
  EXPECT_EQ((MacAddress(std::string("AA:BB:CC:DD:EE:10")) + 5).ToString(), "aa:bb:cc:dd:ee:15");
  EXPECT_EQ((MacAddress(std::string("aa:bb:cc:dd:ee:00")) + -1).ToString(), "aa:bb:cc:dd:ee:fe");
  EXPECT_TRUE((MacAddress(std::string("nonsense")) + 1).ToString().empty());
}

TEST(MacAddress, StreamReadsOneWord) {
  std::istringstream in("001122334455 aa:bb:cc:dd:ee:ff");
  MacAddress a, b;
  in >> a >> b;
  EXPECT_EQ(a.ToString(), "00:11:22:33:44:55");
  EXPECT_EQ(b.ToString(), "aa:bb:cc:dd:ee:ff");
}
