// The 230d dialect: quoted PIN and PUK, signal in bars from +CIND, attempts from *EPINR.
#include "vornwireless/usbmodem_lib/usbmodem_atif_zoom.h"

#include <gtest/gtest.h>

#include <cstdlib>

using vornwireless::usbmodem_lib::USBModem_ATIF;
using vornwireless::usbmodem_lib::USBModem_ATIF_Zoom;

TEST(USBModemATIFZoom, Commands) {
  USBModem_ATIF_Zoom at;
  EXPECT_EQ("AT+CPIN=\"1234\"", at.GetATCommandSetSIMPIN("1234"));
  EXPECT_EQ("AT+CPIN=\"12345678\",\"4321\"", at.GetATCommandSetSIMPUK("12345678", "4321"));
  EXPECT_EQ("AT+CIND?", at.GetATCommandGetRSSI());
  EXPECT_EQ("AT*EPINR=1", at.GetATCommandPINAttempt());
  EXPECT_EQ("AT*EPINR=3", at.GetATCommandPUKAttempt());
  EXPECT_EQ("AT+CPIN?", at.GetATCommandQuarySIMStatus());
  EXPECT_EQ("", at.GetATCommandSetUnsolicitedReports(false));
}

TEST(USBModemATIFZoom, SignalFromIndicatorBars) {
  USBModem_ATIF_Zoom at;
  int level = -1;
  // +CIND: <battchg>,<signal>,<service>,...
  ASSERT_EQ(0, at.ParseRetStringGetSignalLevel("+CIND: 5,4,1,0,0,0,0,0\nOK\n", level));
  EXPECT_EQ(80, level);
  ASSERT_EQ(0, at.ParseRetStringGetSignalLevel("+CIND: 5,5,1,0,0,0,0,0\nOK\n", level));
  EXPECT_EQ(100, level);
  ASSERT_EQ(0, at.ParseRetStringGetSignalLevel("+CIND: 0,0\nOK\n", level));
  EXPECT_EQ(0, level);
  level = 33;
  EXPECT_EQ(-1, at.ParseRetStringGetSignalLevel("+CIND: 5\nOK\n", level));
  EXPECT_EQ(-1, at.ParseRetStringGetSignalLevel("ERROR\n", level));
  EXPECT_EQ(33, level);
}

TEST(USBModemATIFZoom, AttemptsInDefaultFormat) {
  USBModem_ATIF_Zoom at;
  std::string pin;
  std::string puk;
  ASSERT_EQ(0, at.ParseRetStringPINRemainAttempt("*EPINR: 3\nOK\n", pin));
  ASSERT_EQ(0, at.ParseRetStringPUKRemainAttempt("*EPINR: 10\nOK\n", puk));
  EXPECT_EQ(" 3", pin);
  EXPECT_EQ(" 10", puk);
  EXPECT_EQ(3, atoi(pin.c_str()));
  EXPECT_EQ(10, atoi(puk.c_str()));
  pin = "keep";
  EXPECT_EQ(-1, at.ParseRetStringPINRemainAttempt("+CME ERROR: 4\n", pin));
  EXPECT_EQ(-1, at.ParseRetStringPINRemainAttempt("", pin));
  EXPECT_EQ("keep", pin);
}

TEST(USBModemATIFZoom, RegisteredAsVendor230d) {
  USBModem_ATIF* at = USBModem_ATIF::CreateATIF("230d");
  EXPECT_NE(nullptr, dynamic_cast<USBModem_ATIF_Zoom*>(at));
  USBModem_ATIF::DeleteATIF(at);
}
