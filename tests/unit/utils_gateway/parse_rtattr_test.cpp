// parse_rtattr over synthetic attribute runs and over a message of the kernel.
#include "vornwireless/utils/parse_rtattr.h"

#include <arpa/inet.h>
#include <gtest/gtest.h>
#include <linux/if_addr.h>
#include <net/if.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cstring>
#include <string>
#include <vector>

#include "support/syslog_capture.h"

using vorntest::LogLine;
using vornwireless::utils::parse_rtattr;

namespace {

// A run of attributes built by hand, 4-byte aligned.
class Attributes {
 public:
  // Appends an attribute of the given header length with payload bytes (padded to 4).
  Attributes& Add(unsigned short type, const std::string& payload, int lengthField = -1) {
    rtattr a;
    a.rta_type = type;
    a.rta_len = lengthField >= 0 ? static_cast<unsigned short>(lengthField)
                                 : static_cast<unsigned short>(RTA_LENGTH(payload.size()));
    const std::size_t at = bytes_.size();
    bytes_.resize(at + RTA_ALIGN(RTA_LENGTH(payload.size())));
    std::memcpy(&bytes_[at], &a, sizeof a);
    std::memcpy(&bytes_[at + RTA_LENGTH(0)], payload.data(), payload.size());
    return *this;
  }
  Attributes& Raw(const std::string& tail) {
    bytes_.insert(bytes_.end(), tail.begin(), tail.end());
    return *this;
  }
  rtattr* first() { return reinterpret_cast<rtattr*>(bytes_.data()); }
  int size() const { return static_cast<int>(bytes_.size()); }
  char* at(int offset) { return bytes_.data() + offset; }

 private:
  std::vector<char> bytes_;
};

std::string Payload(const rtattr* a) {
  return std::string(static_cast<const char*>(RTA_DATA(a)), RTA_PAYLOAD(a));
}

}  // namespace

TEST(parse_rtattr, StoresByTypeFirstOccurrenceWins) {
  Attributes attrs;
  attrs.Add(1, "first").Add(3, "abcd").Add(1, "second").Add(9, "over max").Add(0, "zero");
  rtattr* table[6];
  rtattr sentinel;
  for (auto& slot : table) slot = &sentinel;
  vorntest::SyslogCapture log;
  EXPECT_EQ(parse_rtattr(table, 4, attrs.first(), attrs.size()), 0);
  ASSERT_NE(table[1], nullptr);
  EXPECT_EQ(Payload(table[1]), "first");
  ASSERT_NE(table[3], nullptr);
  EXPECT_EQ(Payload(table[3]), "abcd");
  ASSERT_NE(table[0], nullptr);
  EXPECT_EQ(Payload(table[0]), "zero");
  EXPECT_EQ(table[2], nullptr);
  EXPECT_EQ(table[4], nullptr);
  EXPECT_EQ(table[5], &sentinel);  // beyond max: untouched
  EXPECT_TRUE(log.Lines().empty()) << log.Dump();
}

TEST(parse_rtattr, EmptyRunClearsTheTable) {
  rtattr sentinel;
  rtattr* table[3] = {&sentinel, &sentinel, &sentinel};
  vorntest::SyslogCapture log;
  EXPECT_EQ(parse_rtattr(table, 2, nullptr, 0), 0);
  EXPECT_EQ(table[0], nullptr);
  EXPECT_EQ(table[1], nullptr);
  EXPECT_EQ(table[2], nullptr);
  EXPECT_TRUE(log.Lines().empty()) << log.Dump();
}

TEST(parse_rtattr, TrailingBytesAreADeficit) {
  Attributes attrs;
  attrs.Add(1, "abcd").Raw("xy");
  rtattr* table[3];
  vorntest::SyslogCapture log;
  EXPECT_EQ(parse_rtattr(table, 2, attrs.first(), attrs.size()), 0);
  ASSERT_NE(table[1], nullptr);
  EXPECT_EQ(Payload(table[1]), "abcd");
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/parse_rtattr.cpp", "!!!Deficit 2, rta_len=8")))
      << log.Dump();
}

TEST(parse_rtattr, LengthBelowHeaderEndsTheWalk) {
  Attributes attrs;
  attrs.Add(1, "abcd").Add(2, "efgh", 2).Add(3, "ijkl");
  rtattr* table[4];
  vorntest::SyslogCapture log;
  EXPECT_EQ(parse_rtattr(table, 3, attrs.first(), attrs.size()), 0);
  EXPECT_NE(table[1], nullptr);
  EXPECT_EQ(table[2], nullptr);
  EXPECT_EQ(table[3], nullptr);
  EXPECT_TRUE(log.HasOnce(
      LOG_ERR, LogLine("utils/parse_rtattr.cpp", "Bad attribute length 2, 16 bytes left")))
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/parse_rtattr.cpp", "!!!Deficit 16, rta_len=2")))
      << log.Dump();
}

TEST(parse_rtattr, LengthBeyondTheRunEndsTheWalk) {
  Attributes attrs;
  attrs.Add(1, "abcd").Add(2, "efgh", 400);
  rtattr* table[3];
  vorntest::SyslogCapture log;
  EXPECT_EQ(parse_rtattr(table, 2, attrs.first(), attrs.size()), 0);
  EXPECT_NE(table[1], nullptr);
  EXPECT_EQ(table[2], nullptr);
  EXPECT_TRUE(log.HasOnce(
      LOG_ERR, LogLine("utils/parse_rtattr.cpp", "Bad attribute length 400, 8 bytes left")))
      << log.Dump();
}

TEST(parse_rtattr, UnalignedLastAttribute) {
  // A 5-byte attribute at the end of a 5-byte run: padding would pass the end.
  Attributes attrs;
  attrs.Add(1, "abcd").Add(2, "e");
  rtattr* table[3];
  vorntest::SyslogCapture log;
  EXPECT_EQ(parse_rtattr(table, 2, attrs.first(), attrs.size() - 3), 0);
  ASSERT_NE(table[2], nullptr);
  EXPECT_EQ(Payload(table[2]), "e");
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/parse_rtattr.cpp", "!!!Deficit -3, rta_len=5")))
      << log.Dump();
}

TEST(parse_rtattr, AddressMessageOfTheKernel) {
  // Ask the kernel for the IPv4 addresses and take apart the one of eth0.
  int fd = socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC, NETLINK_ROUTE);
  ASSERT_GE(fd, 0);
  struct {
    nlmsghdr h;
    ifaddrmsg a;
  } req;
  std::memset(&req, 0, sizeof req);
  req.h.nlmsg_len = NLMSG_LENGTH(sizeof(ifaddrmsg));
  req.h.nlmsg_type = RTM_GETADDR;
  req.h.nlmsg_flags = NLM_F_REQUEST | NLM_F_DUMP;
  req.h.nlmsg_seq = 1;
  req.a.ifa_family = AF_INET;
  ASSERT_EQ(send(fd, &req, req.h.nlmsg_len, 0), static_cast<ssize_t>(req.h.nlmsg_len));
  const unsigned int eth0 = if_nametoindex("eth0");
  ASSERT_NE(eth0, 0u);
  bool found = false, done = false;
  std::vector<char> buf(65536);
  vorntest::SyslogCapture log;
  while (!done) {
    ssize_t n = recv(fd, buf.data(), buf.size(), 0);
    ASSERT_GT(n, 0);
    int len = static_cast<int>(n);
    for (nlmsghdr* h = reinterpret_cast<nlmsghdr*>(buf.data()); NLMSG_OK(h, len);
         h = NLMSG_NEXT(h, len)) {
      if (h->nlmsg_type == NLMSG_DONE || h->nlmsg_type == NLMSG_ERROR) {
        done = true;
        break;
      }
      ifaddrmsg* ifa = static_cast<ifaddrmsg*>(NLMSG_DATA(h));
      if (ifa->ifa_index != eth0) continue;
      rtattr* table[IFA_MAX + 1];
      EXPECT_EQ(parse_rtattr(table, 7, IFA_RTA(ifa), static_cast<int>(IFA_PAYLOAD(h))), 0);
      ASSERT_NE(table[IFA_LOCAL], nullptr);
      ASSERT_NE(table[IFA_LABEL], nullptr);
      char text[INET_ADDRSTRLEN];
      ASSERT_NE(inet_ntop(AF_INET, RTA_DATA(table[IFA_LOCAL]), text, sizeof text), nullptr);
      EXPECT_STREQ(text, "10.200.1.2");
      EXPECT_STREQ(static_cast<const char*>(RTA_DATA(table[IFA_LABEL])), "eth0");
      EXPECT_EQ(ifa->ifa_prefixlen, 24);
      found = true;
    }
  }
  close(fd);
  EXPECT_TRUE(found);
  EXPECT_TRUE(log.Lines().empty()) << log.Dump();
}
