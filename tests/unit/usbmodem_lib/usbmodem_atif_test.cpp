// The standard 3GPP dialect: every command text, every parser fed with replies as the node filter
// hands them over (echo and blank lines gone, each line ended by a line feed), the vendor factory
// and the argument check that keeps a second command off the line.
#include "vornwireless/usbmodem_lib/usbmodem_atif.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <memory>

#include "support/syslog_capture.h"
#include "vornwireless/usbmodem_lib/usbmodem_atif_dlink.h"
#include "vornwireless/usbmodem_lib/usbmodem_atif_huawei.h"
#include "vornwireless/usbmodem_lib/usbmodem_atif_pantech.h"
#include "vornwireless/usbmodem_lib/usbmodem_atif_zoom.h"

using vornwireless::usbmodem_lib::IsSafeATArgument;
using vornwireless::usbmodem_lib::USBModem_ATIF;
using vorntest::LogLine;
using vorntest::SyslogCapture;
namespace ul = vornwireless::usbmodem_lib;

namespace {

const char kFile[] = "usbmodem_lib/usbmodem_atif.cpp";

struct AtifDeleter {
  void operator()(USBModem_ATIF* p) const { USBModem_ATIF::DeleteATIF(p); }
};
typedef std::unique_ptr<USBModem_ATIF, AtifDeleter> AtifPtr;

}  // namespace

TEST(USBModemATIF, BaseCommandsAreThe3GPPForms) {
  USBModem_ATIF at;
  EXPECT_EQ("AT+CPIN?", at.GetATCommandQuarySIMStatus());
  EXPECT_EQ("AT+CPIN=1234", at.GetATCommandSetSIMPIN("1234"));
  EXPECT_EQ("AT+CPIN=12345678,4321", at.GetATCommandSetSIMPUK("12345678", "4321"));
  EXPECT_EQ("AT+CPWD=\"SC\",\"1234\",\"5678\"", at.GetATCommandChangePINCode("1234", "5678"));
  EXPECT_EQ("AT+CLCK=\"SC\",1,\"1234\"", at.GetATCommandChangePINEnable("1", "1234"));
  EXPECT_EQ("AT+CLCK=\"SC\",0,\"1234\"", at.GetATCommandChangePINEnable("0", "1234"));
  EXPECT_EQ("AT+CLCK=\"SC\",2", at.GetATCommandGetPINEnable());
  EXPECT_EQ("AT+CSQ", at.GetATCommandGetRSSI());
  EXPECT_EQ("AT+CFUN?", at.GetATCommandGetHardwareFuncLvl());
  EXPECT_EQ("AT+CFUN=1", at.GetATCommandSetHardwareFuncLvl("1"));
  EXPECT_EQ("AT+CGMI", at.GetATCommandGetVendorName());
  EXPECT_EQ("AT+CGMM", at.GetATCommandGetProductName());
  EXPECT_EQ("AT+CIMI", at.GetATCommandGetIMSI());
  EXPECT_EQ("AT+CREG?", at.GetATCommandGetRoaming());
  EXPECT_EQ("AT+COPS?", at.GetATCommandGetDefaultISP());
  EXPECT_EQ("AT+CGDCONT?", at.GetATCommandGetDefaultAPN());
  EXPECT_EQ("AT+EPINC?", at.GetATCommandPINAttempt());
  EXPECT_EQ("AT+EPINC?", at.GetATCommandPUKAttempt());
  EXPECT_EQ("", at.GetATCommandGetUnsolicitedReports());
  EXPECT_EQ("", at.GetATCommandSetUnsolicitedReports(true));
  EXPECT_EQ("", at.GetATCommandSetUnsolicitedReports(false));
  EXPECT_EQ("AT+CGDCONT=1,\"ip\",\"internet\"", at.GetATCommandSetAPN("1", "internet"));
}

TEST(USBModemATIF, SimStatusOfEachReply) {
  USBModem_ATIF at;
  EXPECT_EQ(ul::SIM_READY, at.ParseRetStringQuarySIMStatus("+CPIN: READY\nOK\n"));
  EXPECT_EQ(ul::SIM_PIN, at.ParseRetStringQuarySIMStatus("+CPIN: SIM PIN\nOK\n"));
  EXPECT_EQ(ul::SIM_PUK, at.ParseRetStringQuarySIMStatus("+CPIN: SIM PUK\nOK\n"));
  EXPECT_EQ(ul::SIM_BUSY, at.ParseRetStringQuarySIMStatus("+CME ERROR: SIM BUSY\n"));
  EXPECT_EQ(ul::SIM_FAILURE, at.ParseRetStringQuarySIMStatus("+CME ERROR: SIM failure\n"));
  EXPECT_EQ(ul::SIM_ERROR, at.ParseRetStringQuarySIMStatus("+CME ERROR: SIM not inserted\n"));
  EXPECT_EQ(ul::SIM_ERROR, at.ParseRetStringQuarySIMStatus("ERROR\n"));
  EXPECT_EQ(ul::SIM_UNKNOWN, at.ParseRetStringQuarySIMStatus("+CPIN: PH-SIM PIN\nOK\n"));
  EXPECT_EQ(ul::SIM_UNKNOWN, at.ParseRetStringQuarySIMStatus("OK\n"));
  EXPECT_EQ(ul::SIM_UNKNOWN, at.ParseRetStringQuarySIMStatus(""));
  // The status of a one-port dongle lent to the dialler is never parsed: the SIM handler sets it.
  EXPECT_EQ(3, ul::SIM_MUTE);
}

TEST(USBModemATIF, PinPromptWinsOverAnErrorInTheSameReply) {
  USBModem_ATIF at;
  EXPECT_EQ(ul::SIM_PIN, at.ParseRetStringQuarySIMStatus("+CPIN: SIM PIN\nERROR\n"));
  EXPECT_EQ(ul::SIM_PUK, at.ParseRetStringQuarySIMStatus("ERROR\n+CPIN: SIM PUK\n"));
  EXPECT_EQ(ul::SIM_READY, at.ParseRetStringQuarySIMStatus("+CPIN: READY\nBUSY\n"));
}

TEST(USBModemATIF, GetLineWithDelimReadsNumberedFields) {
  std::string out;
  ASSERT_EQ(0, USBModem_ATIF::GetLineWithDelim("+EPINC: 3, 2, 10, 9\nOK\n", ',', 1, out));
  EXPECT_EQ(" 3", out);  // the leading blank stays
  ASSERT_EQ(0, USBModem_ATIF::GetLineWithDelim("+EPINC: 3, 2, 10, 9\nOK\n", ',', 3, out));
  EXPECT_EQ(" 10", out);
  // The last field of the line is not ended by the delimiter: it runs on into the rest.
  ASSERT_EQ(0, USBModem_ATIF::GetLineWithDelim("+EPINC: 3, 2, 10, 9\nOK\n", ',', 4, out));
  EXPECT_EQ(" 9\nOK\n", out);
  // Only the first colon counts.
  ASSERT_EQ(0, USBModem_ATIF::GetLineWithDelim("+X: a:b,c\n", ',', 1, out));
  EXPECT_EQ(" a:b", out);
  // An empty field is a field.
  ASSERT_EQ(0, USBModem_ATIF::GetLineWithDelim("^CPIN: READY,,10,3\n", ',', 2, out));
  EXPECT_EQ("", out);
}

TEST(USBModemATIF, GetLineWithDelimFailuresAreLoggedAndLeaveTheOutput) {
  SyslogCapture log;
  std::string out = "untouched";
  EXPECT_EQ(-1, USBModem_ATIF::GetLineWithDelim("+CSQ: 1,2\n", ',', 0, out));
  EXPECT_EQ(-1, USBModem_ATIF::GetLineWithDelim("", ',', 1, out));
  EXPECT_EQ(-1, USBModem_ATIF::GetLineWithDelim("+CME ERROR: 10\n", ',', 1, out));
  EXPECT_EQ(-1, USBModem_ATIF::GetLineWithDelim("123456\nOK\n", ',', 1, out));
  EXPECT_EQ(-1, USBModem_ATIF::GetLineWithDelim("+CREG: 0\n", ',', 2, out));
  EXPECT_EQ("untouched", out);
  EXPECT_EQ(2u, log.Matching(LogLine(kFile, "error on input args of GetLineWithDelim")).size())
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "key ERROR found in input string: (+CME ERROR: 10\\n)")))
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "cannot find ':' in input string: (123456\\nOK\\n)")))
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "cannot find field 2 in input string: (+CREG: 0\\n)")))
      << log.Dump();
}

TEST(USBModemATIF, DefaultFormatTakesTheValueOfTheFirstLine) {
  USBModem_ATIF at;
  std::string out;
  ASSERT_EQ(0, at.ParseRetStringDefaultFormat("001010123456789\nOK\n", out));
  EXPECT_EQ("001010123456789", out);  // a bare line as it stands
  ASSERT_EQ(0, at.ParseRetStringDefaultFormat("+CGMI: Example Mobile\nOK\n", out));
  EXPECT_EQ(" Example Mobile", out);  // after the colon, with its blank
  ASSERT_EQ(0, at.ParseRetStringDefaultFormat("^CURC: 1\nOK\n", out));
  EXPECT_EQ(" 1", out);
  ASSERT_EQ(0, at.ParseRetStringDefaultFormat("E3372", out));  // no line feed at all
  EXPECT_EQ("E3372", out);
}

TEST(USBModemATIF, DefaultFormatRefusesEmptyAndErrorReplies) {
  USBModem_ATIF at;
  SyslogCapture log;
  std::string out = "keep";
  EXPECT_EQ(-1, at.ParseRetStringDefaultFormat("", out));
  EXPECT_EQ(-1, at.ParseRetStringDefaultFormat("+CME ERROR: 3\n", out));
  EXPECT_EQ("keep", out);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "error on input string for parsing should not be empty")))
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "error on input string: +CME ERROR: 3"))) << log.Dump();
}

TEST(USBModemATIF, IsOK) {
  USBModem_ATIF at;
  SyslogCapture log;
  EXPECT_EQ(0, at.ParseRetStringIsOK("OK\n"));
  EXPECT_EQ(0, at.ParseRetStringIsOK("+CFUN: 1\nOK\n"));
  EXPECT_EQ(-1, at.ParseRetStringIsOK("ERROR\n"));
  EXPECT_EQ(-1, at.ParseRetStringIsOK("+CME ERROR: incorrect password\n"));
  EXPECT_EQ(-1, at.ParseRetStringIsOK("OK\nERROR\n"));
  EXPECT_EQ(-1, at.ParseRetStringIsOK("+CPIN: READY\n"));
  EXPECT_EQ(-1, at.ParseRetStringIsOK(""));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "error on input string for parsing should not be empty")))
      << log.Dump();
}

TEST(USBModemATIF, SignalLevelInPercent) {
  USBModem_ATIF at;
  int level = -7;
  ASSERT_EQ(0, at.ParseRetStringGetSignalLevel("+CSQ: 31,99\nOK\n", level));
  EXPECT_EQ(100, level);
  ASSERT_EQ(0, at.ParseRetStringGetSignalLevel("+CSQ: 1,99\nOK\n", level));
  EXPECT_EQ(3, level);
  ASSERT_EQ(0, at.ParseRetStringGetSignalLevel("+CSQ: 20,99\nOK\n", level));
  EXPECT_EQ(64, level);
  ASSERT_EQ(0, at.ParseRetStringGetSignalLevel("+CSQ: 0,0\nOK\n", level));
  EXPECT_EQ(0, level);
}

TEST(USBModemATIF, UnknownSignalGivesNoLevel) {
  USBModem_ATIF at;
  SyslogCapture log;
  int level = 42;
  EXPECT_EQ(-1, at.ParseRetStringGetSignalLevel("+CSQ: 99,99\nOK\n", level));
  EXPECT_EQ(42, level);
  EXPECT_EQ(-1, at.ParseRetStringGetSignalLevel("+CSQ: 32,99\nOK\n", level));
  EXPECT_EQ(-1, at.ParseRetStringGetSignalLevel("+CME ERROR: 30\n", level));
  EXPECT_EQ(-1, at.ParseRetStringGetSignalLevel("", level));
  EXPECT_EQ(42, level);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "invalid signal value 99 in input string: (+CSQ: 99,99\\nOK\\n)")))
      << log.Dump();
}

TEST(USBModemATIF, RoamingIsStateFive) {
  USBModem_ATIF at;
  std::string roaming;
  ASSERT_EQ(0, at.ParseRetStringGetRoaming("+CREG: 2,5,\"1A2B\",\"0C3D\",2\nOK\n", roaming));
  EXPECT_EQ("true", roaming);
  ASSERT_EQ(0, at.ParseRetStringGetRoaming("+CREG: 2,1,\"1A2B\",\"0C3D\",2\nOK\n", roaming));
  EXPECT_EQ("false", roaming);
}

TEST(USBModemATIF, RoamingStateAtTheEndOfTheLineRunsOnAndIsNotMatched) {
  USBModem_ATIF at;
  std::string roaming;
  // "+CREG: 0,5": the second field is "5\nOK\n", so it does not read as roaming.
  ASSERT_EQ(0, at.ParseRetStringGetRoaming("+CREG: 0,5\nOK\n", roaming));
  EXPECT_EQ("false", roaming);
  ASSERT_EQ(0, at.ParseRetStringGetRoaming("+CREG: 0,5,\n", roaming));
  EXPECT_EQ("true", roaming);
  roaming = "keep";
  EXPECT_EQ(-1, at.ParseRetStringGetRoaming("+CREG: 0\nOK\n", roaming));
  EXPECT_EQ(-1, at.ParseRetStringGetRoaming("ERROR\n", roaming));
  EXPECT_EQ("keep", roaming);
}

TEST(USBModemATIF, OperatorAndApnAreQuotedFields) {
  USBModem_ATIF at;
  std::string isp;
  ASSERT_EQ(0, at.ParseRetStringDefaultISP("+COPS: 0,0,\"Test Net\",2\nOK\n", isp));
  EXPECT_EQ("Test Net", isp);
  isp = "keep";
  EXPECT_EQ(-1, at.ParseRetStringDefaultISP("+COPS: 0\nOK\n", isp));  // not registered
  EXPECT_EQ("keep", isp);

  std::string apn;
  ASSERT_EQ(0, at.ParseRetStringDefaultAPN(
                   "+CGDCONT: 1,\"IP\",\"internet\",\"0.0.0.0\",0,0\n"
                   "+CGDCONT: 2,\"IP\",\"mms\",\"0.0.0.0\",0,0\nOK\n",
                   apn));
  EXPECT_EQ("internet", apn);
  apn = "keep";
  EXPECT_EQ(-1, at.ParseRetStringDefaultAPN("OK\n", apn));
  EXPECT_EQ(-1, at.ParseRetStringDefaultAPN("+CME ERROR: 4\n", apn));
  EXPECT_EQ("keep", apn);
}

TEST(USBModemATIF, BaseAttemptFieldsOfEpinc) {
  USBModem_ATIF at;
  std::string pin;
  std::string puk;
  ASSERT_EQ(0, at.ParseRetStringPINRemainAttempt("+EPINC: 3, 3, 10, 10\nOK\n", pin));
  ASSERT_EQ(0, at.ParseRetStringPUKRemainAttempt("+EPINC: 2, 3, 9, 10\nOK\n", puk));
  EXPECT_EQ(" 3", pin);
  EXPECT_EQ(" 9", puk);
  EXPECT_EQ(3, atoi(pin.c_str()));
  EXPECT_EQ(9, atoi(puk.c_str()));
}

TEST(USBModemATIF, UnknownVendorGetsBaseDialectAndItsAttemptQueryMayFail) {
  SyslogCapture log;
  AtifPtr at(USBModem_ATIF::CreateATIF("1234"));
  ASSERT_NE(nullptr, at.get());
  EXPECT_EQ(typeid(USBModem_ATIF), typeid(*at));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Unknown vendor id 1234, assign default ATIF"))) << log.Dump();
  EXPECT_EQ("AT+EPINC?", at->GetATCommandPINAttempt());
  // A dongle that does not know the command answers ERROR: no attempt count can be read.
  std::string remain = "keep";
  EXPECT_EQ(-1, at->ParseRetStringPINRemainAttempt("ERROR\n", remain));
  EXPECT_EQ(-1, at->ParseRetStringPUKRemainAttempt("ERROR\n", remain));
  EXPECT_EQ("keep", remain);
}

TEST(USBModemATIF, CreateATIFPicksTheVendorDialect) {
  AtifPtr huawei(USBModem_ATIF::CreateATIF("12d1"));
  AtifPtr dlink(USBModem_ATIF::CreateATIF("2001"));
  AtifPtr pantech(USBModem_ATIF::CreateATIF("106c"));
  AtifPtr zoom(USBModem_ATIF::CreateATIF("230d"));
  EXPECT_EQ(typeid(ul::USBModem_ATIF_Huawei), typeid(*huawei));
  EXPECT_EQ(typeid(ul::USBModem_ATIF_DLink), typeid(*dlink));
  EXPECT_EQ(typeid(ul::USBModem_ATIF_Pantech), typeid(*pantech));
  EXPECT_EQ(typeid(ul::USBModem_ATIF_Zoom), typeid(*zoom));
  EXPECT_EQ(4u, USBModem_ATIF::vendorTable.size());
  // Exact match only: upper case, blanks or a longer id are other vendors.
  SyslogCapture log;
  AtifPtr upper(USBModem_ATIF::CreateATIF("12D1"));
  AtifPtr longer(USBModem_ATIF::CreateATIF("12d1 "));
  AtifPtr empty(USBModem_ATIF::CreateATIF(""));
  EXPECT_EQ(typeid(USBModem_ATIF), typeid(*upper));
  EXPECT_EQ(typeid(USBModem_ATIF), typeid(*longer));
  EXPECT_EQ(typeid(USBModem_ATIF), typeid(*empty));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Unknown vendor id 12D1, assign default ATIF"))) << log.Dump();
  EXPECT_EQ(4u, USBModem_ATIF::vendorTable.size());  // filled once
  USBModem_ATIF::DeleteATIF(nullptr);                // accepted
}

TEST(USBModemATIF, ApnListOfAllContexts) {
  USBModem_ATIF at;
  Json::Value list(Json::arrayValue);
  list.append("stale");
  ASSERT_EQ(0, at.ParseRetStringDefaultAPNList(
                   "+CGDCONT: 1,\"IP\",\"internet\",\"0.0.0.0\",0,0\n"
                   "+CGDCONT: 3,\"IPV4V6\",\"ims.example\",\"\",0,0\nOK\n",
                   list));
  ASSERT_TRUE(list.isArray());
  ASSERT_EQ(2u, list.size());
  EXPECT_EQ("*99***1#", list[0]["number"].asString());
  EXPECT_EQ("internet", list[0]["apn"].asString());
  EXPECT_EQ("*99***3#", list[1]["number"].asString());
  EXPECT_EQ("ims.example", list[1]["apn"].asString());
  EXPECT_EQ(2u, list[0].size());
}

TEST(USBModemATIF, ApnListWithoutContextsIsEmpty) {
  USBModem_ATIF at;
  Json::Value list;
  ASSERT_EQ(0, at.ParseRetStringDefaultAPNList("OK\n", list));
  EXPECT_TRUE(list.isArray());
  EXPECT_EQ(0u, list.size());
}

TEST(USBModemATIF, ApnListFailsOnErrorOrMissingOK) {
  USBModem_ATIF at;
  SyslogCapture log;
  Json::Value list;
  EXPECT_EQ(-1, at.ParseRetStringDefaultAPNList("ERROR\n", list));
  EXPECT_EQ(-1, at.ParseRetStringDefaultAPNList("+CGDCONT: 1,\"IP\",\"internet\",\"0.0.0.0\",0,0\n", list));
  EXPECT_EQ(-1, at.ParseRetStringDefaultAPNList("+CME ERROR: 4\n", list));
  EXPECT_EQ(-1, at.ParseRetStringDefaultAPNList("", list));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "error on input string: ERROR"))) << log.Dump();
  // A context line without its APN is skipped; the rest is still read.
  ASSERT_EQ(0, at.ParseRetStringDefaultAPNList("+CGDCONT: 1,\"IP\",\"\",\"0.0.0.0\",0,0\nOK\n", list));
  EXPECT_EQ(0u, list.size());
}

TEST(USBModemATIF, SafeArgumentsArePrintableWithoutQuoteOrSemicolon) {
  EXPECT_TRUE(IsSafeATArgument("1234"));
  EXPECT_TRUE(IsSafeATArgument("12345678"));
  EXPECT_TRUE(IsSafeATArgument("internet.example-apn.net"));
  EXPECT_TRUE(IsSafeATArgument("*99***1#"));
  EXPECT_TRUE(IsSafeATArgument("user name with blanks"));
  EXPECT_TRUE(IsSafeATArgument(""));
  EXPECT_TRUE(IsSafeATArgument("~!@#$%^&*()_+{}|:<>?`-=[]\\',./ "));

  EXPECT_FALSE(IsSafeATArgument("1234\r"));
  EXPECT_FALSE(IsSafeATArgument("1234\rAT+CLCK=\"SC\",0,\"1234\""));
  EXPECT_FALSE(IsSafeATArgument("1234\n"));
  EXPECT_FALSE(IsSafeATArgument("12\"34"));
  EXPECT_FALSE(IsSafeATArgument("1234;+CFUN=0"));
  EXPECT_FALSE(IsSafeATArgument(std::string("12\0" "34", 5)));
  EXPECT_FALSE(IsSafeATArgument("\t1234"));
  EXPECT_FALSE(IsSafeATArgument("\x1b" "1234"));
  EXPECT_FALSE(IsSafeATArgument("1234\x7f"));
  EXPECT_FALSE(IsSafeATArgument("internet\xc3\xa9"));  // UTF-8 is not printable ASCII
}
