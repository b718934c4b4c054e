// The 12d1 dialect: attempts read from ^CPIN, unsolicited reports through ^CURC; everything else is
// the standard set.
#include "vornwireless/usbmodem_lib/usbmodem_atif_huawei.h"

#include <gtest/gtest.h>

#include <cstdlib>

using vornwireless::usbmodem_lib::USBModem_ATIF;
using vornwireless::usbmodem_lib::USBModem_ATIF_Huawei;

TEST(USBModemATIFHuawei, Commands) {
  USBModem_ATIF_Huawei at;
  EXPECT_EQ("AT^CPIN?", at.GetATCommandPINAttempt());
  EXPECT_EQ("AT^CPIN?", at.GetATCommandPUKAttempt());
  EXPECT_EQ("AT^CURC?", at.GetATCommandGetUnsolicitedReports());
  EXPECT_EQ("AT^CURC=1", at.GetATCommandSetUnsolicitedReports(true));
  EXPECT_EQ("AT^CURC=0", at.GetATCommandSetUnsolicitedReports(false));
  // Not overridden: the standard forms.
  EXPECT_EQ("AT+CPIN?", at.GetATCommandQuarySIMStatus());
  EXPECT_EQ("AT+CPIN=1234", at.GetATCommandSetSIMPIN("1234"));
  EXPECT_EQ("AT+CPIN=12345678,1234", at.GetATCommandSetSIMPUK("12345678", "1234"));
  EXPECT_EQ("AT+CSQ", at.GetATCommandGetRSSI());
  EXPECT_EQ("AT+CGDCONT=2,\"ip\",\"web\"", at.GetATCommandSetAPN("2", "web"));
}

TEST(USBModemATIFHuawei, AttemptsFromCpinReply) {
  USBModem_ATIF_Huawei at;
  // ^CPIN: <code>,[<times>],<puk_times>,<pin_times>,<puk2_times>,<pin2_times>
  const std::string pinLocked = "^CPIN: SIM PIN,3,10,3,10,3\nOK\n";
  const std::string afterTwoWrong = "^CPIN: SIM PIN,1,10,1,10,3\nOK\n";
  const std::string pukLocked = "^CPIN: SIM PUK,10,10,0,10,3\nOK\n";
  const std::string ready = "^CPIN: READY,,10,3,10,3\nOK\n";
  std::string pin;
  std::string puk;
  ASSERT_EQ(0, at.ParseRetStringPINRemainAttempt(pinLocked, pin));
  ASSERT_EQ(0, at.ParseRetStringPUKRemainAttempt(pinLocked, puk));
  EXPECT_EQ("3", pin);
  EXPECT_EQ("10", puk);
  ASSERT_EQ(0, at.ParseRetStringPINRemainAttempt(afterTwoWrong, pin));
  EXPECT_EQ(1, atoi(pin.c_str()));
  ASSERT_EQ(0, at.ParseRetStringPINRemainAttempt(pukLocked, pin));
  ASSERT_EQ(0, at.ParseRetStringPUKRemainAttempt(pukLocked, puk));
  EXPECT_EQ(0, atoi(pin.c_str()));
  EXPECT_EQ(10, atoi(puk.c_str()));
  ASSERT_EQ(0, at.ParseRetStringPINRemainAttempt(ready, pin));
  EXPECT_EQ("3", pin);
  pin = "keep";
  EXPECT_EQ(-1, at.ParseRetStringPINRemainAttempt("+CME ERROR: 13\n", pin));
  EXPECT_EQ(-1, at.ParseRetStringPINRemainAttempt("^CPIN: READY\nOK\n", pin));
  EXPECT_EQ("keep", pin);
}

TEST(USBModemATIFHuawei, UnsolicitedReportState) {
  USBModem_ATIF_Huawei at;
  std::string state;
  ASSERT_EQ(0, at.ParseRetStringDefaultFormat("^CURC: 1\nOK\n", state));
  EXPECT_NE(std::string::npos, state.find('1'));
  ASSERT_EQ(0, at.ParseRetStringDefaultFormat("^CURC: 0\nOK\n", state));
  EXPECT_EQ(std::string::npos, state.find('1'));
  EXPECT_EQ(0, at.ParseRetStringIsOK("OK\n"));
}

TEST(USBModemATIFHuawei, RegisteredAsVendor12d1) {
  USBModem_ATIF* at = USBModem_ATIF::CreateATIF("12d1");
  EXPECT_NE(nullptr, dynamic_cast<USBModem_ATIF_Huawei*>(at));
  USBModem_ATIF::DeleteATIF(at);
}
