// Every reply parser of every AT dialect fed one reply, with the checks of their contract.
#ifndef VORN_FUZZ_ENTRIES_AT_REPLIES_H
#define VORN_FUZZ_ENTRIES_AT_REPLIES_H

#include <json/json.h>

#include <memory>
#include <string>

#include "entries/fuzz_input.h"
#include "vornwireless/usbmodem_lib/usbmodem_atif.h"

namespace vornfuzz {

// The vendors with a dialect of their own, then one that falls back to the standard dialect.
inline const char* AtVendor(unsigned index) {
  static const char* const kVendors[] = {"12d1", "2001", "106c", "230d", "ffff"};
  return kVendors[index % 5];
}

// A string parser: 0 with some output, or -1 with the output left as it was.
template <typename Parse>
int CheckStringParser(Parse parse, std::string const& reply, const char* what) {
  std::string out = "unchanged";
  const int r = parse(reply, out);
  Require(r == 0 || r == -1, what);
  if (r != 0) Require(out == "unchanged", what);
  return r;
}

// The reply's first byte picks the dialect, the rest is the reply text.
inline void ParseAtReply(const uint8_t* data, size_t size) {
  using vornwireless::usbmodem_lib::USBModem_ATIF;
  if (size == 0) return;
  std::unique_ptr<USBModem_ATIF, void (*)(USBModem_ATIF*)> atif(
      USBModem_ATIF::CreateATIF(AtVendor(data[0])), USBModem_ATIF::DeleteATIF);
  const std::string reply(reinterpret_cast<const char*>(data) + 1, size - 1);
  USBModem_ATIF* a = atif.get();

  const int sim = a->ParseRetStringQuarySIMStatus(reply);
  Require(sim >= 0 && sim <= 7 && sim != 3, "a SIM status other than mute");
  int level = -7;
  const int r = a->ParseRetStringGetSignalLevel(reply, level);
  // The Zoom dialect reports its 0..5 reading times 20, whatever the reading.
  const bool percent = data[0] % 5 != 3;
  Require((r == 0 && (!percent || (level >= 0 && level <= 100))) || (r == -1 && level == -7),
          "signal level");
  CheckStringParser([&](std::string const& t, std::string& o) {
    const int x = a->ParseRetStringGetRoaming(t, o);
    if (x == 0) Require(o == "true" || o == "false", "roaming is true or false");
    return x;
  }, reply, "roaming value");
  CheckStringParser([&](std::string const& t, std::string& o) {
    return a->ParseRetStringPINRemainAttempt(t, o);
  }, reply, "PIN attempts");
  CheckStringParser([&](std::string const& t, std::string& o) {
    return a->ParseRetStringPUKRemainAttempt(t, o);
  }, reply, "PUK attempts");
  CheckStringParser([&](std::string const& t, std::string& o) {
    return a->ParseRetStringDefaultISP(t, o);
  }, reply, "ISP");
  CheckStringParser([&](std::string const& t, std::string& o) {
    return a->ParseRetStringDefaultAPN(t, o);
  }, reply, "APN");
  CheckStringParser([&](std::string const& t, std::string& o) {
    return a->ParseRetStringDefaultFormat(t, o);
  }, reply, "one-line answer");
  const int ok = a->ParseRetStringIsOK(reply);
  Require(ok == 0 || ok == -1, "OK check");
  Json::Value list;
  const int lr = a->ParseRetStringDefaultAPNList(reply, list);
  Require((lr == 0 || lr == -1) && list.isArray(), "APN list");
  for (Json::Value const& e : list) {
    Require(e.isObject() && e["number"].isString() && e["apn"].isString(), "APN list entry");
  }
  // The shared field parser with the delimiter and field number from the reply itself.
  if (reply.size() >= 2) {
    std::string out = "unchanged";
    const int g = USBModem_ATIF::GetLineWithDelim(reply.substr(2), reply[0],
                                                 static_cast<signed char>(reply[1]), out);
    Require(g == 0 || (g == -1 && out == "unchanged"), "field parser");
  }
  // A reply that is safe as an argument builds commands of one line.
  if (vornwireless::usbmodem_lib::IsSafeATArgument(reply)) {
    for (std::string const& cmd :
         {a->GetATCommandSetSIMPIN(reply), a->GetATCommandSetSIMPUK(reply, reply),
          a->GetATCommandChangePINCode(reply, reply), a->GetATCommandChangePINEnable("1", reply),
          a->GetATCommandSetAPN("1", reply), a->GetATCommandSetHardwareFuncLvl(reply)}) {
      Require(cmd.find_first_of("\r\n") == std::string::npos, "a command of one line");
    }
  }
}

}  // namespace vornfuzz

#endif
