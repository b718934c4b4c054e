// Checks of one datagram: the autonomous prefixes of an RA, malformed options, short RAs, the
// types the filter lets through. Nothing here reads past the datagram (the sanitizer build runs
// these on heap copies of exactly the datagram's size).
#include <gtest/gtest.h>

#include <memory>
#include <random>

#include "ipv6_test_support.h"
#include "support/syslog_capture.h"
#include "vornwireless/network/ipv6/ipv6_module.h"

namespace {

using ipv6test::Bytes;
using ipv6test::PrefixOption;
using ipv6test::Ra;
using vornnetwork::network::module::IPv6Module;

const char kFile[] = "network/ipv6/ipv6_module.cpp";

// The prefixes of an exact-size heap copy of the datagram.
std::vector<std::string> Prefixes(const Bytes& packet) {
  std::unique_ptr<unsigned char[]> copy(new unsigned char[packet.size() + 0]);
  std::copy(packet.begin(), packet.end(), copy.get());
  return IPv6Module::RaAutoPrefixGet(copy.get(), static_cast<int>(packet.size()), "eth0");
}

TEST(RaPacket, AutonomousPrefixesAreFoundBehindOtherOptions) {
  Bytes ra = Ra(false, false,
                {ipv6test::SourceLinkOption(), PrefixOption("2001:db8:1::"),
                 PrefixOption("2001:db8:2::", 0x80), PrefixOption("2001:db8:3::", 0x40)});
  EXPECT_EQ((std::vector<std::string>{"2001:db8:1::", "2001:db8:3::"}), Prefixes(ra));
}

TEST(RaPacket, ACapturedRadvdAdvertisementGivesItsPrefix) {
  // Captured from radvd in the sandbox: M set, prefix 2001:db8:1::/64 on-link and autonomous,
  // source link-layer address option.
  const Bytes ra = {0x86, 0x00, 0x53, 0xf7, 0x40, 0x80, 0x00, 0x0c, 0x00, 0x00, 0x00, 0x00,
                    0x00, 0x00, 0x00, 0x00, 0x03, 0x04, 0x40, 0xc0, 0x00, 0x01, 0x51, 0x80,
                    0x00, 0x00, 0x38, 0x40, 0x00, 0x00, 0x00, 0x00, 0x20, 0x01, 0x0d, 0xb8,
                    0x00, 0x01, 0x00, 0x00, 0x00, 0x00, 0x00, 0x00, 0x00, 0x00, 0x00, 0x00,
                    0x01, 0x01, 0x66, 0xfe, 0x9e, 0x90, 0xf1, 0x92};
  EXPECT_EQ((std::vector<std::string>{"2001:db8:1::"}), Prefixes(ra));
}

TEST(RaPacket, AZeroLengthOptionEndsTheWalk) {
  vorntest::SyslogCapture log;
  Bytes ra = Ra(false, false, {{3, 0, 0, 0, 0, 0, 0, 0}, PrefixOption("2001:db8:1::")});
  EXPECT_TRUE(Prefixes(ra).empty());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, vorntest::LogLine(kFile, "zero length option in RA")))
      << log.Dump();
}

TEST(RaPacket, AnOptionLongerThanThePacketEndsTheWalk) {
  vorntest::SyslogCapture log;
  Bytes prefix = PrefixOption("2001:db8:1::");
  prefix.resize(24);  // says 32 bytes, 24 arrive
  Bytes ra = Ra(false, false, {PrefixOption("2001:db8:9::"), prefix});
  EXPECT_EQ((std::vector<std::string>{"2001:db8:9::"}), Prefixes(ra));
  EXPECT_TRUE(log.HasOnce(LOG_ERR,
                          vorntest::LogLine(kFile, "option length greater than total length in "
                                                   "RA (type 3, optlen 32, len 24)")))
      << log.Dump();
}

TEST(RaPacket, APrefixOptionOfLengthOneIsDroppedAndTheWalkGoesOn) {
  vorntest::SyslogCapture log;
  Bytes ra = Ra(false, false, {{3, 1, 64, 0xc0, 0, 0, 0, 0}, PrefixOption("2001:db8:5::")});
  EXPECT_EQ((std::vector<std::string>{"2001:db8:5::"}), Prefixes(ra));
  EXPECT_EQ(1u, log.Matching("Drop a prefix option of 8 bytes in RA on \\[eth0\\]").size())
      << log.Dump();
}

TEST(RaPacket, AnOddByteAfterTheOptionsIsNotRead) {
  Bytes ra = Ra(false, false, {PrefixOption("2001:db8:1::")});
  ra.push_back(3);
  EXPECT_EQ((std::vector<std::string>{"2001:db8:1::"}), Prefixes(ra));
}

TEST(RaPacket, ShortAdvertisementsGiveNoPrefix) {
  EXPECT_TRUE(Prefixes(Bytes{134, 0, 0, 0, 64, 0, 0, 0}).empty());
  EXPECT_TRUE(Prefixes(Ra(false, false)).empty());
  EXPECT_TRUE(IPv6Module::RaAutoPrefixGet(nullptr, 0, "eth0").empty());
}

}  // namespace

namespace {

// 20,000 seeded random datagrams of 0 to 120 bytes, each in a heap block of exactly its size
// (the sanitizer build turns any read past it into a failure); options are biased towards the
// prefix type and small lengths so that the walk goes deep.
TEST(RaPacket, RandomDatagramsAreWalkedWithinTheirBounds) {
  std::mt19937 rng(20261125);
  std::size_t found = 0;
  for (int i = 0; i < 20000; ++i) {
    const std::size_t size = rng() % 121;
    std::unique_ptr<unsigned char[]> packet(new unsigned char[size == 0 ? 1 : size]);
    for (std::size_t b = 0; b < size; ++b) {
      unsigned char value = static_cast<unsigned char>(rng());
      if (b >= 16 && rng() % 2 == 0) value = (rng() % 2) ? 3 : static_cast<unsigned char>(rng() % 6);
      packet[b] = value;
    }
    found += IPv6Module::RaAutoPrefixGet(packet.get(), static_cast<int>(size), "eth0").size();
  }
  // Some random datagrams do carry well-formed autonomous prefix options.
  EXPECT_GT(found, 0u);
}

}  // namespace
