// The link watcher of the real vornnetd under a flood of 20,000 address changes with its receive
// buffer forced small (VORN_NETLINK_RCVBUF): the kernel drops events, the watcher notices and reads
// the state again, and after the flood its view of the flooded interface equals the kernel's. And
// its stop on SIGTERM while a hook never ends.
#include <gtest/gtest.h>
#include <signal.h>
#include <stdlib.h>
#include <unistd.h>

#include <chrono>
#include <cstdio>
#include <fstream>
#include <map>
#include <memory>
#include <regex>
#include <set>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include "fixtures/fake_journal.h"
#include "support/daemon_process.h"
#include "support/syslog_capture.h"
#include "support/test_util.h"

namespace {

using vorntest::FakeCall;
using vorntest::FakeCallsTo;

const std::string kLinkUp = "/usr/vorn/libexec/platform/VLIBNetIfLinkUpEvent";
const std::string kLinkDown = "/usr/vorn/libexec/platform/VLIBNetIfLinkDownEvent";
const std::string kIPv4HookDir = "/usr/vorn/etc/hooks/net/ipv4_change";

bool WaitFor(const std::function<bool()>& done, int seconds) {
  const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(seconds);
  while (std::chrono::steady_clock::now() < end) {
    if (done()) return true;
    std::this_thread::sleep_for(std::chrono::milliseconds(20));
  }
  return done();
}

void IpOk(const std::vector<std::string>& args) {
  auto r = vorntest::Ip(args);
  ASSERT_EQ(r.status, 0) << r.err;
}

bool LinkDownReportedFor(const std::string& ifname) {
  for (auto const& c : FakeCallsTo(kLinkDown)) {
    if (c.argv == std::vector<std::string>{ifname}) return true;
  }
  return false;
}

// The kernel's addresses of ifname of one family ("-4" or "-6").
std::set<std::string> KernelAddresses(const std::string& family, const std::string& ifname) {
  auto r = vorntest::Ip({"-o", family, "addr", "show", "dev", ifname});
  std::set<std::string> out;
  std::istringstream lines(r.out);
  std::string line;
  while (std::getline(lines, line)) {
    std::istringstream words(line);
    std::string word;
    while (words >> word) {
      if (word == "inet" || word == "inet6") {
        words >> word;
        out.insert(word.substr(0, word.find('/')));
        break;
      }
    }
  }
  return out;
}

// Whether the kernel calls the link running (IFF_RUNNING in its messages): up, and operationally
// up or of unknown state.
bool KernelRunning(const std::string& ifname) {
  std::ifstream in("/sys/class/net/" + ifname + "/flags");
  unsigned long flags = 0;
  in >> std::hex >> flags;
  const std::string oper = vorntest::ReadFile("/sys/class/net/" + ifname + "/operstate");
  return (flags & 0x1) != 0 && (oper == "up\n" || oper == "unknown\n");
}

struct View {
  std::string link;
  std::string ipv4;
  std::set<std::string> ipv6;
  std::size_t ipv6Count = 0;
};

// The daemon's view as it logged it when it stopped: the last "Netlink view" line per interface.
std::map<std::string, View> LoggedView(std::vector<vorntest::SyslogLine> const& lines) {
  static const std::regex re("Netlink view \\[([^\\]]*)\\]: link=\\[([a-z]*)\\] ipv4=\\[([^\\]]*)\\] "
                             "ipv6=\\[([^\\]]*)\\]$");
  std::map<std::string, View> out;
  for (auto const& line : lines) {
    std::smatch m;
    if (!std::regex_search(line.message, m, re)) continue;
    View v;
    v.link = m[2];
    v.ipv4 = m[3];
    std::istringstream list(m[4].str());
    std::string ip;
    while (std::getline(list, ip, ',')) {
      if (ip.empty()) continue;
      v.ipv6.insert(ip);
      ++v.ipv6Count;
    }
    out[m[1]] = v;
  }
  return out;
}

std::string NetlinkLines(std::vector<vorntest::SyslogLine> const& lines) {
  std::string out;
  for (auto const& l : lines) {
    if (l.message.find("netlink") != std::string::npos || l.message.find("Netlink") != std::string::npos) {
      out += l.tag + " " + l.message.substr(0, 300) + "\n";
    }
  }
  return out;
}

class LinkFlood : public testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    vorntest::Run({"/bin/rm", "-rf", "/usr/vorn/etc/hooks"});
    for (auto const& p : {kLinkUp, kLinkDown}) ASSERT_TRUE(vorntest::InstallFake(p)) << p;
    std::string why;
    ASSERT_TRUE(vorntest::SetPeerLink("eth1", true, &why)) << why;
    vorntest::Ip({"link", "del", "flood0"});
    IpOk({"link", "add", "flood0", "type", "veth", "peer", "name", "flood1"});
    IpOk({"link", "set", "flood0", "addrgenmode", "none"});  // only the flood's addresses
    IpOk({"link", "set", "flood1", "up"});
    IpOk({"link", "set", "flood0", "up"});
    ASSERT_TRUE(WaitFor([] { return KernelRunning("flood0"); }, 5));
  }
  void TearDown() override {
    if (daemon_) daemon_->Stop(SIGTERM);
    vorntest::Ip({"link", "del", "flood0"});
    vorntest::Run({"/bin/rm", "-rf", "/usr/vorn/etc/hooks"});
    for (auto const& p : {kLinkUp, kLinkDown}) unlink(p.c_str());
    unsetenv("VORN_NETLINK_RCVBUF");
  }
  std::unique_ptr<vorntest::DaemonProcess> daemon_;
};

TEST_F(LinkFlood, TwentyThousandChangesThroughASmallBufferLoseNoFinalState) {
  // The first IPv4 change holds the watcher in its hook until the flood is over, so that the
  // small buffer surely overflows; the hook is removed before it is let go.
  ASSERT_EQ(vorntest::Run({"/bin/mkdir", "-p", kIPv4HookDir}).status, 0);
  ASSERT_TRUE(vorntest::WriteFile(kIPv4HookDir + "/10-hold",
                                  "#!/bin/sh\n[ \"$NEW_ADDRESS\" = 10.250.0.1 ] || exit 0\n"
                                  ": > /run/flood-held\n"
                                  "while [ ! -e /run/flood-done ]; do sleep 0.05; done\n",
                                  0755));
  unlink("/run/flood-held");
  unlink("/run/flood-done");
  setenv("VORN_NETLINK_RCVBUF", "1", 1);  // the kernel's floor: a handful of messages
  vorntest::SyslogCapture log;
  daemon_ = std::make_unique<vorntest::DaemonProcess>(std::vector<std::string>{VORNNETD},
                                                      "com.vornlink.net");
  ASSERT_TRUE(daemon_->ready());
  // Until the watcher runs: the hold address is reported (added again until it is).
  ASSERT_TRUE(WaitFor(
      [] {
        vorntest::Ip({"addr", "del", "10.250.0.1/32", "dev", "eth1"});
        vorntest::Ip({"addr", "add", "10.250.0.1/32", "dev", "eth1"});
        return WaitFor([] { return access("/run/flood-held", F_OK) == 0; }, 1);
      },
      20));

  // 10,000 IPv6 changes (5,000 additions, 4,995 removals, 5 left) and 10,000 IPv4 changes (each
  // address replaced by the next one; the last is an addition), then the carrier goes.
  std::string batch;
  for (int i = 1; i <= 5000; ++i) {
    batch += "address add fd00:f100::" + std::to_string(i) + "/128 dev flood0 nodad\n";
    if (i > 5) batch += "address del fd00:f100::" + std::to_string(i - 5) + "/128 dev flood0\n";
  }
  auto v4 = [](int i) {
    return "10.60." + std::to_string(i / 250) + "." + std::to_string(i % 250 + 1) + "/32";
  };
  batch += "address add " + v4(0) + " dev flood0\n";
  for (int i = 1; i < 5000; ++i) {
    batch += "address del " + v4(i - 1) + " dev flood0\n";
    batch += "address add " + v4(i) + " dev flood0\n";
  }
  batch += "address add 10.61.0.1/32 dev flood0\n";  // the 10,000th IPv4 change
  batch += "link set flood1 down\n";
  auto r = vorntest::Run({"/usr/sbin/ip", "-batch", "-"}, batch);
  ASSERT_EQ(r.status, 0) << r.err;
  // The kernel tells an IPv6 address from a work queue as it leaves the tentative state: the
  // marker follows once every addition was told.
  ASSERT_TRUE(WaitFor(
      [] { return vorntest::Ip({"-6", "addr", "show", "dev", "flood0"}).out.find("tentative") ==
                  std::string::npos; },
      20));
  vorntest::Run({"/bin/rm", "-f", kIPv4HookDir + "/10-hold"});
  ASSERT_TRUE(vorntest::WriteFile("/run/flood-done", ""));

  // The marker: eth1's cable pulled after the flood. Reported (by its message or by the state
  // read again) only after everything before it.
  std::string why;
  ASSERT_TRUE(vorntest::SetPeerLink("eth1", false, &why)) << why;
  ASSERT_TRUE(WaitFor([] { return LinkDownReportedFor("eth1"); }, 120))
      << "the watcher did not report the marker";
  // The marker may have come with the state read again after a loss, whose report ends with its
  // log line: every loss seen before the marker has then been reported whole.
  int lost = 0;
  int reread = 0;
  auto count = [&] {
    lost = 0;
    reread = 0;
    for (auto const& l : log.Lines()) {
      lost += l.message.find("Netlink events lost (ENOBUFS)") != std::string::npos;
      reread += l.message.find("Netlink state read again") != std::string::npos;
    }
    return reread == lost;
  };
  EXPECT_TRUE(WaitFor(count, 60)) << lost << " losses, " << reread << " reports";
  ASSERT_EQ(0, daemon_->Stop(SIGTERM));
  daemon_.reset();

  const auto lines = log.Lines();
  std::printf("flood: overflows (ENOBUFS) %d, state read again %d times\n", lost, reread);
  EXPECT_GE(lost, 1) << "the buffer never overflowed: the test did not try the re-reading";

  const std::map<std::string, View> view = LoggedView(lines);
  ASSERT_EQ(view.count("flood0"), 1u) << log.Dump();
  const View& flood = view.at("flood0");
  const std::set<std::string> kernel6 = KernelAddresses("-6", "flood0");
  EXPECT_EQ(kernel6.size(), 5u);
  EXPECT_EQ(flood.ipv6, kernel6) << NetlinkLines(lines);
  EXPECT_EQ(flood.ipv6Count, kernel6.size());  // no address twice
  const std::set<std::string> kernel4 = KernelAddresses("-4", "flood0");
  EXPECT_EQ(kernel4, (std::set<std::string>{"10.61.0.1", "10.60.19.250"}));
  EXPECT_EQ(flood.ipv4, "10.61.0.1");  // the last address added
  EXPECT_EQ(flood.link, "down");
  // Every link the daemon knows is in the state the kernel gives it.
  for (auto const& v : view) {
    if (access(("/sys/class/net/" + v.first).c_str(), F_OK) != 0) continue;
    EXPECT_EQ(v.second.link, KernelRunning(v.first) ? "up" : "down") << v.first;
  }
  // flood0's carrier loss was reported once, as the last link event of flood0.
  int downs = 0;
  for (auto const& c : FakeCallsTo(kLinkDown)) downs += c.argv == std::vector<std::string>{"flood0"};
  EXPECT_EQ(downs, 1);
}

TEST_F(LinkFlood, SigtermEndsTheDaemonWhileAHookNeverEnds) {
  ASSERT_EQ(vorntest::Run({"/bin/mkdir", "-p", kIPv4HookDir}).status, 0);
  ASSERT_TRUE(vorntest::WriteFile(kIPv4HookDir + "/10-hang",
                                  "#!/bin/sh\nsleep 1000 &\n"
                                  "echo \"$$ $! $(ps -o pgid= -p $$)\" > /run/hang-hook\nwait\n",
                                  0755));
  unlink("/run/hang-hook");
  daemon_ = std::make_unique<vorntest::DaemonProcess>(std::vector<std::string>{VORNNETD},
                                                      "com.vornlink.net");
  ASSERT_TRUE(daemon_->ready());
  pid_t hook = 0, child = 0, group = 0;
  ASSERT_TRUE(WaitFor(
      [&] {
        vorntest::Ip({"addr", "del", "10.250.0.2/32", "dev", "eth1"});
        vorntest::Ip({"addr", "add", "10.250.0.2/32", "dev", "eth1"});
        return WaitFor(
            [&] {
              std::istringstream in(vorntest::ReadFile("/run/hang-hook"));
              return static_cast<bool>(in >> hook >> child >> group);
            },
            1);
      },
      20));
  const auto start = std::chrono::steady_clock::now();
  EXPECT_EQ(0, daemon_->Stop(SIGTERM));  // exit status 0 (Stop gives up after 20 s)
  const double took =
      std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
  std::printf("vornnetd exited %.3f s after SIGTERM with a hook sleeping 1000 s\n", took);
  daemon_.reset();
  // Neither the hook, nor its child, nor anything of its process group outlives the daemon.
  EXPECT_TRUE(WaitFor([&] { return kill(hook, 0) != 0 && kill(child, 0) != 0; }, 5))
      << hook << " " << child;
  EXPECT_EQ(group, hook) << "the hook does not lead a process group of its own";
  EXPECT_TRUE(WaitFor([&] { return kill(-group, 0) != 0; }, 5)) << group;
}

}  // namespace
