// Inputs that once broke a fuzz target, each fed to the entry the target calls and checked for
// the right answer; then every seed and kept input of fuzz/ replayed through its entry (an entry
// aborts when the code under it breaks its contract).
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include "entries/at_replies.h"
#include "entries/info_files.h"
#include "entries/key_files.h"
#include "entries/net_methods.h"
#include "entries/netlink_datagrams.h"
#include "entries/route_files.h"
#include "entries/usbmodem_methods.h"
#include "vornplatform/file.h"
#include "vornplatform/szhash.h"
#include "vornwireless/usbmodem_lib/usbmodem_atif.h"

namespace {

namespace fs = std::filesystem;
using vornwireless::usbmodem_lib::USBModem_ATIF;

std::string FuzzDir() { return std::string(std::getenv("VORN_SOURCE_DIR")) + "/fuzz"; }

std::string ReadBytes(std::string const& path) {
  std::ifstream in(path, std::ios::binary);
  return std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

// The kept input, which must exist (a missing fixture is a failure).
std::string Kept(std::string const& name) {
  const std::string path = FuzzDir() + "/regressions/" + name;
  EXPECT_TRUE(fs::is_regular_file(path)) << path;
  return ReadBytes(path);
}

const uint8_t* Bytes(std::string const& s) { return reinterpret_cast<const uint8_t*>(s.data()); }

void WriteFile(std::string const& path, std::string const& text) {
  std::ofstream(path, std::ios::binary) << text;
}

struct Hash {
  PVLIBSZHASH h = nullptr;
  ~Hash() { VLIBCSzHashFree(h); }
  std::string Get(const char* key) const {
    const char* v = VLIBCSzHashGetValue(h, key);
    return v ? v : "<absent>";
  }
};

// A key line whose key holds a NUL byte made the whole key file unreadable (-1).
TEST(FuzzRegressionKeyFile, AKeyWithANulByteIsSkippedAndTheOtherKeysAreRead) {
  const std::string input = Kept("key-file/nul-key-line");
  vornfuzz::ReadKeyFile(Bytes(input), input.size());
  WriteFile("/tmp/nul-key", std::string("A=1\n\0?=x\nB=2\n", 13));
  Hash keys;
  EXPECT_EQ(VLIBCFileGetKeys("/tmp/nul-key", 0, &keys.h, nullptr), 2);
  EXPECT_EQ(keys.Get("A"), "1");
  EXPECT_EQ(keys.Get("B"), "2");
  char buf[64];
  EXPECT_EQ(VLIBCFileGetKeyValue("/tmp/nul-key", "B", buf, sizeof buf, 0), 1);
  EXPECT_STREQ(buf, "2");
}

// A value holding NUL bytes: its length counts them, the text ends at the first.
TEST(FuzzRegressionKeyFile, AValueWithNulBytesIsReadUpToTheFirst) {
  const std::string input = Kept("key-file/nul-in-value");
  vornfuzz::ReadKeyFile(Bytes(input), input.size());
  WriteFile("/tmp/nul-value", std::string("single=ab\0cd\n", 13));
  char buf[64];
  EXPECT_EQ(VLIBCFileGetKeyValue("/tmp/nul-value", "single", buf, sizeof buf, 0), 5);
  EXPECT_STREQ(buf, "ab");
}

// The same key line inside a section made that section unreadable (-1).
TEST(FuzzRegressionSectionFile, AKeyWithANulByteIsSkippedAndTheSectionIsRead) {
  const std::string input = Kept("section-file/nul-key-in-section");
  vornfuzz::ReadSectionFile(Bytes(input), input.size());
  WriteFile("/tmp/nul-section", std::string("[second]\nkey\0x=\"q\"\nb=2\n[third]\nc=3\n", 36));
  Hash keys;
  EXPECT_EQ(VLIBCFileGetSection("/tmp/nul-section", "second", &keys.h), 1);
  EXPECT_EQ(keys.Get("b"), "2");
  char buf[64];
  EXPECT_EQ(VLIBCFileGetSectionValue("/tmp/nul-section", "third", "c", buf, sizeof buf), 1);
  EXPECT_STREQ(buf, "3");
}

TEST(FuzzRegressionSectionFile, AnEmptySectionNameIsListedButNotRead) {
  const std::string input = Kept("section-file/empty-section-name");
  vornfuzz::ReadSectionFile(Bytes(input), input.size());
  WriteFile("/tmp/empty-name", "[a]\nk=v\n[]\nx=1\n");
  vornfuzz::ListGuard list;
  EXPECT_EQ(VLIBCFileEnumSection("/tmp/empty-name", &list.l), 2);
  EXPECT_STREQ(VLIBCSzListGet(list.l, 1), "");
  Hash keys;
  EXPECT_EQ(VLIBCFileGetSection("/tmp/empty-name", "", &keys.h), -1);
}

// The Zoom dialect multiplies the reading by 20 without a range check; a reading too large for
// the product overflowed an int (undefined behaviour, a crash under UBSan).
TEST(FuzzRegressionAtReply, ZoomSignalReadingTooLargeForALevelIsRefused) {
  const std::string input = Kept("at-reply/zoom-level-overflow");
  vornfuzz::ParseAtReply(Bytes(input), input.size());
  std::unique_ptr<USBModem_ATIF, void (*)(USBModem_ATIF*)> zoom(USBModem_ATIF::CreateATIF("230d"),
                                                                 USBModem_ATIF::DeleteATIF);
  int level = -7;
  EXPECT_EQ(zoom->ParseRetStringGetSignalLevel("+CIND: 0,999999999\nOK\n", level), -1);
  EXPECT_EQ(level, -7);
  EXPECT_EQ(zoom->ParseRetStringGetSignalLevel("+CIND: 0,-999999999\nOK\n", level), -1);
  EXPECT_EQ(level, -7);
  EXPECT_EQ(zoom->ParseRetStringGetSignalLevel("+CIND: 0,3\nOK\n", level), 0);
  EXPECT_EQ(level, 60);
  // Field 2 runs on to the end of the reply: " 10\nOK\n" reads as 10, level 200.
  EXPECT_EQ(zoom->ParseRetStringGetSignalLevel("$QCPINSTAT: 3, 10\nOK\n", level), 0);
  EXPECT_EQ(level, 200);
  const std::string over = Kept("at-reply/zoom-level-over-100");
  vornfuzz::ParseAtReply(Bytes(over), over.size());
}

// A request ending in an unterminated comment: the comment was kept with the request's values
// and written back into the reply, which then was no JSON.
TEST(FuzzRegressionNetMethods, CommentsOfARequestDoNotReachTheReply) {
  const std::string input = Kept("net/unterminated-comment");
  const int byInterface = 6;
  ASSERT_STREQ(vornfuzz::NetMethodAt(byInterface).name, "GetGatewayDataByInterface");
  vornfuzz::NetAnswer a = vornfuzz::CallNetMethod(byInterface, input);
  vornfuzz::CheckNetAnswer(byInterface, input, a);
  ASSERT_TRUE(a.ok);
  EXPECT_EQ(a.out.find("/*"), std::string::npos) << a.out;
  Json::Value reply;
  Json::Reader reader(Json::Features::strictMode());
  ASSERT_TRUE(reader.parse(a.out, reply)) << a.out;
  EXPECT_TRUE(reply["request"]["slave"].asBool());
  EXPECT_EQ(reply["request"]["method"].asString(), "GET_GATEWAY_DATA_BY_INTERFACE");
}

// Arrays nested deeper than jsoncpp's stack limit made the reader throw out of the handler and
// end the daemon; such text is now refused like any text that is not JSON.
TEST(FuzzRegressionNetMethods, TextNestedDeeperThanTheParserLimitIsNotJson) {
  const std::string input = Kept("net/nested-deeper-than-the-parser-limit");
  ASSERT_GE(input.size(), 1001u);
  for (int m = 0; m < vornfuzz::kNetMethodCount; ++m) {
    vornfuzz::NetAnswer a = vornfuzz::CallNetMethod(m, input);
    vornfuzz::CheckNetAnswer(m, input, a);
    if (vornfuzz::NetMethodAt(m).jsonArgument) {
      EXPECT_FALSE(a.ok) << m;
      EXPECT_FALSE(a.hasError) << m;  // the handler of unparsable text sets no error
    }
  }
}

// The same depth as a profile: refused with the profile error, the modem untouched.
TEST(FuzzRegressionUsbmodemMethods, AProfileNestedDeeperThanTheParserLimitIsRefused) {
  const std::string input = Kept("usbmodem/nested-profile");
  const int setProfile = 8;
  ASSERT_STREQ(vornfuzz::UsbmodemMethodAt(setProfile).name, "SetProfile");
  std::vector<std::string> args;
  vornfuzz::UsbmodemAnswer a =
      vornfuzz::CallUsbmodemMethodWithInput(setProfile, Bytes(input), input.size(), args);
  vornfuzz::CheckUsbmodemAnswer(setProfile, args, a);
  EXPECT_FALSE(a.ok);
  EXPECT_EQ(a.domain, "error");
}

// Every file of a seed or regression directory.
std::vector<std::string> InputsOf(std::string const& dir) {
  std::vector<std::string> out;
  for (const char* kind : {"/corpus/", "/regressions/"}) {
    const std::string d = FuzzDir() + kind + dir;
    if (!fs::is_directory(d)) continue;
    for (auto const& e : fs::directory_iterator(d)) out.push_back(ReadBytes(e.path()));
  }
  return out;
}

TEST(FuzzSeedReplay, EveryKeptInputPassesEveryHandlerOfBothServices) {
  const auto net = InputsOf("net");
  ASSERT_GE(net.size(), 10u);
  for (std::string const& in : net) {
    for (int m = 0; m < vornfuzz::kNetMethodCount; ++m) {
      const std::string arg = vornfuzz::SplitArgs(Bytes(in), in.size(), 1)[0];
      vornfuzz::CheckNetAnswer(m, arg, vornfuzz::CallNetMethod(m, arg));
    }
  }
  const auto usb = InputsOf("usbmodem");
  ASSERT_GE(usb.size(), 5u);
  for (std::string const& in : usb) {
    for (int m = 0; m < vornfuzz::kUsbmodemMethodCount; ++m) {
      std::vector<std::string> args;
      auto a = vornfuzz::CallUsbmodemMethodWithInput(m, Bytes(in), in.size(), args);
      vornfuzz::CheckUsbmodemAnswer(m, args, a);
    }
  }
}

TEST(FuzzSeedReplay, EveryKeptInputPassesItsParser) {
  size_t fed = 0;
  for (std::string const& in : InputsOf("at-reply")) {
    vornfuzz::ParseAtReply(Bytes(in), in.size());
    ++fed;
  }
  // The route seeds hold two default routes each; the one of the lower metric wins (the IPv6
  // metric column is read as decimal: 64 before 400).
  for (std::string const& in : InputsOf("route-v4")) {
    vornfuzz::RouteFileAnswer a = vornfuzz::ReadRouteFile<AF_INET>(Bytes(in), in.size());
    EXPECT_EQ(a.gateway, "192.168.1.1");
    EXPECT_EQ(a.count, 2);
    ++fed;
  }
  for (std::string const& in : InputsOf("route-v6")) {
    vornfuzz::RouteFileAnswer a = vornfuzz::ReadRouteFile<AF_INET6>(Bytes(in), in.size());
    EXPECT_EQ(a.gateway, "fe80::2");
    EXPECT_EQ(a.count, 2);
    ++fed;
  }
  for (std::string const& in : InputsOf("key-file")) {
    vornfuzz::ReadKeyFile(Bytes(in), in.size());
    ++fed;
  }
  for (std::string const& in : InputsOf("section-file")) {
    vornfuzz::ReadSectionFile(Bytes(in), in.size());
    ++fed;
  }
  mkdir(vornfuzz::kNodePrefix, 0755);
  for (std::string const& in : InputsOf("info-file")) {
    vornfuzz::ReadInfoFile(Bytes(in), in.size());
    ++fed;
  }
  EXPECT_GE(fed, 20u);
}

TEST(FuzzSeedReplay, EveryKeptDatagramPassesTheLinkWatcher) {
  vornfuzz::RemoveEventPrograms();
  vornnetwork::network::module::NetlinkModule module;
  ASSERT_EQ(module.Initialize(), 0);
  vornfuzz::DatagramSender sender;
  const auto datagrams = InputsOf("netlink");
  ASSERT_GE(datagrams.size(), 5u);
  for (std::string const& d : datagrams) {
    vornfuzz::FeedDatagram(module, sender, Bytes(d), d.size());
  }
  EXPECT_EQ(module.Terminate(), 0);
}

}  // namespace
