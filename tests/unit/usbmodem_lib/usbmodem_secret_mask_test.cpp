// Commands carrying a PIN, PUK or password are logged with those values masked.
#include "vornwireless/usbmodem_lib/usbmodem_secret_mask.h"

#include <gtest/gtest.h>

using vornwireless::usbmodem_lib::MaskSecretsInCommand;

TEST(SecretMask, PinAndPukEntriesAreMaskedInEveryDialect) {
  EXPECT_EQ(MaskSecretsInCommand("AT+CPIN=1234"), "AT+CPIN=****");
  EXPECT_EQ(MaskSecretsInCommand("AT+CPIN=12345678,4321"), "AT+CPIN=****,****");
  EXPECT_EQ(MaskSecretsInCommand("AT+CPIN=\"1234\""), "AT+CPIN=\"****\"");
  EXPECT_EQ(MaskSecretsInCommand("AT+CPIN=\"12345678\",\"4321\""), "AT+CPIN=\"****\",\"****\"");
  EXPECT_EQ(MaskSecretsInCommand("at+cpin=\"1,2\""), "at+cpin=\"****\"");
}

TEST(SecretMask, LockAndPasswordChangeKeepFacilityAndModeOnly) {
  EXPECT_EQ(MaskSecretsInCommand("AT+CLCK=\"SC\",1,\"1234\""), "AT+CLCK=\"SC\",1,\"****\"");
  EXPECT_EQ(MaskSecretsInCommand("AT+CLCK=\"SC\",2"), "AT+CLCK=\"SC\",2");
  EXPECT_EQ(MaskSecretsInCommand("AT+CPWD=\"SC\",\"1234\",\"4321\""),
            "AT+CPWD=\"SC\",\"****\",\"****\"");
}

TEST(SecretMask, OtherCommandsStayAsTheyAre) {
  for (const char* c : {"AT+CPIN?", "AT+CSQ", "AT+CGDCONT=1,\"ip\",\"web\"", "AT^CPIN?", "ATD*99#"}) {
    EXPECT_EQ(MaskSecretsInCommand(c), c);
  }
}
