// Default routes from recorded route files and from the kernel's own files on a veth.
#include "vornwireless/utils/get_default_route.h"

#include <gtest/gtest.h>
#include <sys/socket.h>

#include <string>
#include <vector>

#include "support/syslog_capture.h"
#include "support/test_util.h"

using vorntest::LogLine;
using vornwireless::utils::GetDefaultRoute;
using vornwireless::utils::GetNumDefaultRoutes;
using vornwireless::utils::routeparse::ParseV4;
using vornwireless::utils::routeparse::ParseV6;
using vornwireless::utils::routeparse::Route;

namespace {

const char kV4Header[] =
    "Iface\tDestination\tGateway \tFlags\tRefCnt\tUse\tMetric\tMask\t\tMTU\tWindow\tIRTT"
    "                                                       \n";

// Points a parser's RouteFile at a recorded text for the lifetime of the object.
template <typename Parser>
class RecordedRouteFile {
 public:
  explicit RecordedRouteFile(const std::string& text) : saved_(Parser::RouteFile) {
    path_ = dir_ / "route";
    vorntest::WriteFile(path_, text);
    Parser::RouteFile = path_.c_str();
  }
  ~RecordedRouteFile() { Parser::RouteFile = saved_; }

 private:
  vorntest::TempDir dir_;
  std::string path_;
  const char* saved_;
};

vorntest::RunResult Ip(std::vector<std::string> args) {
  args.insert(args.begin(), "/sbin/ip");
  return vorntest::Run(args);
}

}  // namespace

TEST(RouteFiles, KernelPaths) {
  EXPECT_STREQ(ParseV4::RouteFile, "/proc/net/route");
  EXPECT_STREQ(ParseV6::RouteFile, "/proc/net/ipv6_route");
}

TEST(Route, OrdersByMetric) {
  Route a, b;
  a.metric = 0;
  b.metric = 100;
  EXPECT_TRUE(a < b);
  EXPECT_FALSE(b < a);
}

TEST(ParseV4, DefaultRouteOfARecordedLine) {
  std::vector<Route> routes;
  ParseV4 parse;
  parse(kV4Header, routes);
  EXPECT_TRUE(routes.empty());
  parse("eth0\t00000000\t0101C80A\t0003\t0\t0\t100\t00000000\t0\t0\t0\n", routes);
  ASSERT_EQ(routes.size(), 1u);
  EXPECT_EQ(routes[0].ifname, "eth0");
  EXPECT_EQ(routes[0].gateway, "10.200.1.1");  // the kernel's byte order is kept
  EXPECT_EQ(routes[0].metric, 100);
}

TEST(ParseV4, OnlyUpGatewayRoutesToZero) {
  std::vector<Route> routes;
  ParseV4 parse;
  // Destination 0 without the gateway flag: not a default route.
  parse("eth0\t00000000\t00000000\t0001\t0\t0\t0\t00000000\t0\t0\t0\n", routes);
  // A network route with a gateway.
  parse("eth0\t0000010A\t0101C80A\t0003\t0\t0\t0\t0000FFFF\t0\t0\t0\n", routes);
  // Gateway flag but not up.
  parse("eth0\t00000000\t0101C80A\t0002\t0\t0\t0\t00000000\t0\t0\t0\n", routes);
  // Cut lines.
  parse("eth0\t00000000\t0101C80A\t0003\t0\t0\n", routes);
  parse("eth0\t00000000\t0101C80A\tflags\t0\t0\t0\n", routes);
  parse("", routes);
  EXPECT_TRUE(routes.empty());
  parse("eth1\t00000000\t0101C80A\t0007\t0\t0\t5\t00000000\t0\t0\t0\n", routes);  // + host flag
  EXPECT_EQ(routes.size(), 1u);
}

TEST(ParseV4, FormatAddress) {
  EXPECT_EQ(ParseV4::formatAddress("0101C80A"), "10.200.1.1");
  EXPECT_EQ(ParseV4::formatAddress("00000000"), "0.0.0.0");
  EXPECT_EQ(ParseV4::formatAddress("zz"), "");
  EXPECT_EQ(ParseV4::formatAddress("123456789"), "");
}

TEST(GetDefaultRoute, LowestMetricOfARecordedFile) {
  RecordedRouteFile<ParseV4> file(std::string(kV4Header) +
                                  "eth0\t00000000\t0101C80A\t0003\t0\t0\t100\t00000000\t0\t0\t0\n"
                                  "eth0\t0001C80A\t00000000\t0001\t0\t0\t0\t00FFFFFF\t0\t0\t0\n"
                                  "eth1\t00000000\t0102C80A\t0003\t0\t0\t0\t00000000\t0\t0\t0\n"
                                  "eth1\t00000000\t00000000\t0001\t0\t0\t0\t00000000\t0\t0\t0\n");
  EXPECT_EQ(GetDefaultRoute<AF_INET>(), "10.200.2.1");
  EXPECT_EQ(GetNumDefaultRoutes<AF_INET>(), 2);
}

TEST(GetDefaultRoute, NoDefaultRoute) {
  RecordedRouteFile<ParseV4> file(std::string(kV4Header) +
                                  "eth0\t0001C80A\t00000000\t0001\t0\t0\t0\t00FFFFFF\t0\t0\t0\n");
  EXPECT_EQ(GetDefaultRoute<AF_INET>(), "");
  EXPECT_EQ(GetNumDefaultRoutes<AF_INET>(), 0);
}

TEST(GetDefaultRoute, MissingRouteFile) {
  const char* saved = ParseV4::RouteFile;
  ParseV4::RouteFile = "/nonexistent/route";
  vorntest::SyslogCapture log;
  EXPECT_EQ(GetNumDefaultRoutes<AF_INET>(), -1);
  EXPECT_EQ(GetDefaultRoute<AF_INET>(), "");
  ParseV4::RouteFile = saved;
  EXPECT_EQ(log.Matching(LogLine("utils/get_default_route.cpp",
                                 "Unable to open route file: /nonexistent/route"))
                .size(),
            2u)
      << log.Dump();
}

TEST(ParseV6, RecordedLines) {
  std::vector<Route> routes;
  ParseV6 parse;
  // The loopback's unreachable default route has no gateway flag.
  parse(
      "00000000000000000000000000000000 00 00000000000000000000000000000000 00 "
      "00000000000000000000000000000000 ffffffff 00000001 00000000 00200200       lo\n",
      routes);
  // A network route.
  parse(
      "fe800000000000000000000000000000 40 00000000000000000000000000000000 00 "
      "00000000000000000000000000000000 00000100 00000001 00000000 00000001     eth0\n",
      routes);
  EXPECT_TRUE(routes.empty());
  parse(
      "00000000000000000000000000000000 00 00000000000000000000000000000000 00 "
      "fe800000000000000000000000000001 00000400 00000001 00000000 00450003     eth0\n",
      routes);
  ASSERT_EQ(routes.size(), 1u);
  EXPECT_EQ(routes[0].gateway, "fe80::1");
  EXPECT_EQ(routes[0].ifname, "eth0");
  EXPECT_EQ(routes[0].metric, 400);  // the hexadecimal column read as decimal
}

TEST(ParseV6, AllZeroNextHopIsTheUnspecifiedAddress) {
  std::vector<Route> routes;
  ParseV6 parse;
  parse(
      "00000000000000000000000000000000 00 00000000000000000000000000000000 00 "
      "00000000000000000000000000000000 00000400 00000001 00000000 00000003     ppp0\n",
      routes);
  ASSERT_EQ(routes.size(), 1u);
  EXPECT_EQ(routes[0].gateway, "::");
  EXPECT_EQ(routes[0].ifname, "ppp0");
}

TEST(ParseV6, FormatAddress) {
  EXPECT_EQ(ParseV6::formatAddress("20010db8000000000000000000000001"), "2001:db8::1");
  EXPECT_EQ(ParseV6::formatAddress("00000000000000000000000000000000"), "::");
  EXPECT_EQ(ParseV6::formatAddress("0000"), "");
  vorntest::SyslogCapture log;
  EXPECT_EQ(ParseV6::formatAddress("2001zdb8000000000000000000000001"), "");
  EXPECT_TRUE(
      log.HasOnce(LOG_ERR, LogLine("utils/get_default_route.cpp", "convert gateway format failed")))
      << log.Dump();
}

TEST(GetDefaultRoute, RecordedIPv6File) {
  RecordedRouteFile<ParseV6> file(
      "00000000000000000000000000000000 00 00000000000000000000000000000000 00 "
      "fe800000000000000000000000000001 00000400 00000001 00000000 00450003     eth0\n"
      "00000000000000000000000000000000 00 00000000000000000000000000000000 00 "
      "20010db8000000000000000000000001 00000100 00000001 00000000 00000003     eth1\n"
      "00000000000000000000000000000000 00 00000000000000000000000000000000 00 "
      "00000000000000000000000000000000 ffffffff 00000001 00000000 00200200       lo\n");
  EXPECT_EQ(GetDefaultRoute<AF_INET6>(), "2001:db8::1");
  EXPECT_EQ(GetNumDefaultRoutes<AF_INET6>(), 2);
}

TEST(KernelRoutes, TwoIPv4DefaultRoutes) {
  EXPECT_EQ(GetNumDefaultRoutes<AF_INET>(), 0);
  EXPECT_EQ(GetDefaultRoute<AF_INET>(), "");
  ASSERT_EQ(Ip({"route", "add", "default", "via", "10.200.1.1", "metric", "100"}).status, 0);
  ASSERT_EQ(Ip({"route", "add", "default", "via", "10.200.1.9", "metric", "0"}).status, 0);
  EXPECT_EQ(GetDefaultRoute<AF_INET>(), "10.200.1.9");
  EXPECT_EQ(GetNumDefaultRoutes<AF_INET>(), 2);
  // A default route over the device alone has no gateway flag.
  ASSERT_EQ(Ip({"route", "add", "default", "dev", "eth0", "metric", "50"}).status, 0);
  EXPECT_EQ(GetNumDefaultRoutes<AF_INET>(), 2);
  while (Ip({"-4", "route", "del", "default"}).status == 0) {
  }
  EXPECT_EQ(GetNumDefaultRoutes<AF_INET>(), 0);
}

TEST(KernelRoutes, IPv6DefaultRoutes) {
  // The loopback's unreachable route is no default route.
  EXPECT_EQ(GetNumDefaultRoutes<AF_INET6>(), 0);
  ASSERT_EQ(Ip({"-6", "addr", "add", "2001:db8:1::2/64", "dev", "eth0", "nodad"}).status, 0);
  ASSERT_EQ(Ip({"-6", "route", "add", "default", "via", "fe80::1", "dev", "eth0", "metric", "512"})
                .status,
            0);
  ASSERT_EQ(Ip({"-6", "route", "add", "default", "via", "2001:db8:1::1", "metric", "256"}).status,
            0);
  EXPECT_EQ(GetNumDefaultRoutes<AF_INET6>(), 2);
  EXPECT_EQ(GetDefaultRoute<AF_INET6>(), "2001:db8:1::1");
  while (Ip({"-6", "route", "del", "default"}).status == 0) {
  }
  EXPECT_EQ(GetNumDefaultRoutes<AF_INET6>(), 0);
  EXPECT_EQ(GetDefaultRoute<AF_INET6>(), "");
}
