// IP address values, IPv4 subnet arithmetic and the address queries of a real interface.
#include "vornwireless/utils/ip_address.h"

#include <gtest/gtest.h>

#include <sstream>

#include "support/syslog_capture.h"
#include "support/test_util.h"

using vornwireless::utils::IPAddress;
using vorntest::LogLine;
using vorntest::SyslogCapture;
namespace u = vornwireless::utils;

namespace {

void Ip(std::vector<std::string> args) {
  args.insert(args.begin(), "/usr/sbin/ip");
  auto r = vorntest::Run(args);
  ASSERT_EQ(r.status, 0) << r.err;
}

IPAddress::AddressList List(std::initializer_list<std::pair<std::string, int>> items) {
  return IPAddress::AddressList(items);
}

}  // namespace

TEST(IPAddress, DefaultIsEmptyWithAllOnes) {
  IPAddress ip;
  EXPECT_TRUE(ip.IsEmpty());
  EXPECT_EQ(ip.ToString(), "");
  EXPECT_EQ(ip.GetInAddr().s_addr, 0xffffffffu);
}

TEST(IPAddress, TextThatIsNoAddressIsEmptyAndTwoSuchAreEqual) {
  IPAddress a(std::string("not an address"));
  IPAddress b(std::string("300.1.2.3"));
  EXPECT_TRUE(a.IsEmpty());
  EXPECT_TRUE(b.IsEmpty());
  EXPECT_TRUE(a == b);
  EXPECT_FALSE(a != b);
  EXPECT_EQ(a, IPAddress());
}

TEST(IPAddress, KeepsTheTextAsGiven) {
  IPAddress v4(std::string("192.168.1.10"));
  EXPECT_EQ(v4.ToString(), "192.168.1.10");
  EXPECT_STREQ(v4.ToCString(), "192.168.1.10");
  EXPECT_EQ(static_cast<std::string>(v4), "192.168.1.10");
  EXPECT_STREQ(static_cast<char const*>(v4), "192.168.1.10");
  EXPECT_EQ(ntohl(v4.GetInAddr().s_addr), 0xc0a8010au);

  IPAddress v6(std::string("fe80::1"));
  EXPECT_FALSE(v6.IsEmpty());
  EXPECT_EQ(v6.ToString(), "fe80::1");
  // Two spellings of one IPv6 address differ.
  EXPECT_TRUE(IPAddress(std::string("fe80::1")) != IPAddress(std::string("fe80:0::1")));
}

TEST(IPAddress, Ipv6KeepsTheBinaryFieldAndAssignmentReplacesText) {
  IPAddress ip(std::string("10.0.0.1"));
  ip = std::string("2001:db8::5");
  EXPECT_EQ(ip.ToString(), "2001:db8::5");
  EXPECT_EQ(ntohl(ip.GetInAddr().s_addr), 0x0a000001u);
  ip = std::string("garbage");
  EXPECT_TRUE(ip.IsEmpty());
  IPAddress copy(ip);
  EXPECT_TRUE(copy.IsEmpty());
}

TEST(IPAddress, StreamReadsOneWord) {
  std::istringstream in("10.1.1.1 nonsense 2001:db8::1");
  IPAddress a, b, c;
  in >> a >> b >> c;
  EXPECT_EQ(a.ToString(), "10.1.1.1");
  EXPECT_TRUE(b.IsEmpty());
  EXPECT_EQ(c.ToString(), "2001:db8::1");
}

TEST(SubnetArithmetic, NetworkBeginEnd) {
  IPAddress ip(std::string("192.168.1.77")), mask(std::string("255.255.255.0"));
  IPAddress network = u::GetNetwork(ip, mask);
  EXPECT_EQ(network.ToString(), "192.168.1.0");
  EXPECT_EQ(u::GetIpAddressBegin(network, mask).ToString(), "192.168.1.1");
  EXPECT_EQ(u::GetIpAddressEnd(network, mask).ToString(), "192.168.1.254");
  IPAddress mask16(std::string("255.255.0.0"));
  IPAddress net16 = u::GetNetwork(std::string("10.20.30.40"), mask16);
  EXPECT_EQ(net16.ToString(), "10.20.0.0");
  EXPECT_EQ(u::GetIpAddressBegin(net16, mask16).ToString(), "10.20.0.1");
  EXPECT_EQ(u::GetIpAddressEnd(net16, mask16).ToString(), "10.20.255.254");
}

TEST(SubnetArithmetic, NextNetwork) {
  EXPECT_EQ(u::GetNextNetwork(std::string("192.168.1.0"), std::string("255.255.255.0")).ToString(),
            "192.168.2.0");
  EXPECT_EQ(u::GetNextNetwork(std::string("10.0.0.0"), std::string("255.255.0.0")).ToString(),
            "10.1.0.0");
  EXPECT_EQ(
      u::GetNextNetwork(std::string("192.168.1.128"), std::string("255.255.255.128")).ToString(),
      "192.168.2.0");
  EXPECT_TRUE(u::GetNextNetwork(std::string("fe80::1"), std::string("255.255.255.0")).IsEmpty());
  EXPECT_TRUE(u::GetNextNetwork(IPAddress(), std::string("255.255.255.0")).IsEmpty());
}

TEST(InterfaceQueries, AddressesAndNetworksOfAVeth) {
  Ip({"addr", "add", "192.168.50.9/20", "dev", "eth0"});
  Ip({"addr", "add", "2001:db8:1:2:3::9/61", "dev", "eth0", "nodad"});
  EXPECT_EQ(IPAddress::GetIPv4Address("eth0"),
            List({{"10.200.1.2", 24}, {"192.168.50.9", 20}}));
  EXPECT_EQ(IPAddress::GetIPv4Network("eth0"), List({{"10.200.1.0", 24}, {"192.168.48.0", 20}}));
  auto v6 = IPAddress::GetIPv6Address("eth0");
  auto v6net = IPAddress::GetIPv6Network("eth0");
  bool found = false, foundNet = false;
  for (auto const& a : v6) found |= a == std::make_pair(std::string("2001:db8:1:2:3::9"), 61);
  for (auto const& a : v6net) foundNet |= a == std::make_pair(std::string("2001:db8:1::"), 61);
  EXPECT_TRUE(found);
  EXPECT_TRUE(foundNet);
  EXPECT_TRUE(IPAddress::GetIPv4Address("nosuchif0").empty());
  EXPECT_TRUE(IPAddress::GetIPv6Network("nosuchif0").empty());
  Ip({"addr", "del", "192.168.50.9/20", "dev", "eth0"});
  Ip({"addr", "del", "2001:db8:1:2:3::9/61", "dev", "eth0"});
}

TEST(InterfaceQueries, Ipv6PrefixCountsUpToTheFirstPartialByte) {
  Ip({"addr", "add", "2001:db8:aa:bb::1/52", "dev", "eth0", "nodad"});
  bool found = false;
  for (auto const& a : IPAddress::GetIPv6Network("eth0")) {
    found |= a == std::make_pair(std::string("2001:db8:aa::"), 52);
  }
  EXPECT_TRUE(found);
  Ip({"addr", "del", "2001:db8:aa:bb::1/52", "dev", "eth0"});
}

TEST(GetIPv6NetworkPart, MasksByPrefix) {
  EXPECT_EQ(IPAddress::GetIPv6NetworkPart("2001:db8:1234:5678::1", 64), "2001:db8:1234:5678::");
  EXPECT_EQ(IPAddress::GetIPv6NetworkPart("2001:db8:1234:5678::1", 36), "2001:db8:1000::");
  EXPECT_EQ(IPAddress::GetIPv6NetworkPart("2001:db8::1", 128), "2001:db8::1");
  EXPECT_EQ(IPAddress::GetIPv6NetworkPart("2001:db8::1", 0), "::");
  SyslogCapture log;
  EXPECT_EQ(IPAddress::GetIPv6NetworkPart("192.168.1.1", 64), "");
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/ip_address.cpp",
                                           "Unable to convert 192.168.1.1 to binary form")))
      << log.Dump();
}
