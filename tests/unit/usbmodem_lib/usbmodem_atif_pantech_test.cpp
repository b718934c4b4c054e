// The 106c dialect: attempts from AT_OERCN.
#include "vornwireless/usbmodem_lib/usbmodem_atif_pantech.h"

#include <gtest/gtest.h>

#include <cstdlib>

using vornwireless::usbmodem_lib::USBModem_ATIF;
using vornwireless::usbmodem_lib::USBModem_ATIF_Pantech;

TEST(USBModemATIFPantech, Commands) {
  USBModem_ATIF_Pantech at;
  EXPECT_EQ("AT_OERCN", at.GetATCommandPINAttempt());
  EXPECT_EQ("AT_OERCN", at.GetATCommandPUKAttempt());
  EXPECT_EQ("AT+CPIN=1234", at.GetATCommandSetSIMPIN("1234"));
  EXPECT_EQ("AT+CPIN=12345678,1234", at.GetATCommandSetSIMPUK("12345678", "1234"));
  EXPECT_EQ("AT+CSQ", at.GetATCommandGetRSSI());
}

TEST(USBModemATIFPantech, AttemptsFromOercn) {
  USBModem_ATIF_Pantech at;
  // _OERCN: <pin_times>, <puk_times>
  const std::string reply = "_OERCN: 3, 10\nOK\n";
  std::string pin;
  std::string puk;
  ASSERT_EQ(0, at.ParseRetStringPINRemainAttempt(reply, pin));
  ASSERT_EQ(0, at.ParseRetStringPUKRemainAttempt(reply, puk));
  EXPECT_EQ(" 3", pin);
  EXPECT_EQ(" 10\nOK\n", puk);  // the last field of the line runs on; atoi reads the number
  EXPECT_EQ(3, atoi(pin.c_str()));
  EXPECT_EQ(10, atoi(puk.c_str()));
  ASSERT_EQ(0, at.ParseRetStringPINRemainAttempt("_OERCN: 0, 9\nOK\n", pin));
  EXPECT_EQ(0, atoi(pin.c_str()));
  puk = "keep";
  EXPECT_EQ(-1, at.ParseRetStringPUKRemainAttempt("_OERCN: 3\nOK\n", puk));
  EXPECT_EQ(-1, at.ParseRetStringPUKRemainAttempt("ERROR\n", puk));
  EXPECT_EQ("keep", puk);
}

TEST(USBModemATIFPantech, RegisteredAsVendor106c) {
  USBModem_ATIF* at = USBModem_ATIF::CreateATIF("106c");
  EXPECT_NE(nullptr, dynamic_cast<USBModem_ATIF_Pantech*>(at));
  USBModem_ATIF::DeleteATIF(at);
}
