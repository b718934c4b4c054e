// The 2001 dialect: PIN and PUK in double quotes, attempts from +EPINC.
#include "vornwireless/usbmodem_lib/usbmodem_atif_dlink.h"

#include <gtest/gtest.h>

#include <cstdlib>

using vornwireless::usbmodem_lib::USBModem_ATIF;
using vornwireless::usbmodem_lib::USBModem_ATIF_DLink;

TEST(USBModemATIFDLink, QuotedPinAndPuk) {
  USBModem_ATIF_DLink at;
  EXPECT_EQ("AT+CPIN=\"1234\"", at.GetATCommandSetSIMPIN("1234"));
  EXPECT_EQ("AT+CPIN=\"12345678\",\"4321\"", at.GetATCommandSetSIMPUK("12345678", "4321"));
  EXPECT_EQ("AT+EPINC?", at.GetATCommandPINAttempt());
  EXPECT_EQ("AT+EPINC?", at.GetATCommandPUKAttempt());
  EXPECT_EQ("AT+CPIN?", at.GetATCommandQuarySIMStatus());
  EXPECT_EQ("AT+CSQ", at.GetATCommandGetRSSI());
  EXPECT_EQ("", at.GetATCommandGetUnsolicitedReports());
  EXPECT_EQ("AT+CPWD=\"SC\",\"1234\",\"9876\"", at.GetATCommandChangePINCode("1234", "9876"));
}

TEST(USBModemATIFDLink, AttemptsFromEpinc) {
  USBModem_ATIF_DLink at;
  // +EPINC: <pin1>,<pin2>,<puk1>,<puk2>
  std::string pin;
  std::string puk;
  ASSERT_EQ(0, at.ParseRetStringPINRemainAttempt("+EPINC: 2,3,10,10\nOK\n", pin));
  ASSERT_EQ(0, at.ParseRetStringPUKRemainAttempt("+EPINC: 2,3,8,10\nOK\n", puk));
  EXPECT_EQ(2, atoi(pin.c_str()));
  EXPECT_EQ(8, atoi(puk.c_str()));
  pin = "keep";
  EXPECT_EQ(-1, at.ParseRetStringPINRemainAttempt("ERROR\n", pin));
  EXPECT_EQ("keep", pin);
}

TEST(USBModemATIFDLink, RegisteredAsVendor2001) {
  USBModem_ATIF* at = USBModem_ATIF::CreateATIF("2001");
  EXPECT_NE(nullptr, dynamic_cast<USBModem_ATIF_DLink*>(at));
  USBModem_ATIF::DeleteATIF(at);
}
