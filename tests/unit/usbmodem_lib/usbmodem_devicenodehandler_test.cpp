// The device node handler against real pseudo-terminals: a small in-test dongle answers on the
// master side of each PTY (echo, replies, silence, BUSY, cut-off lines), and the modem simulator
// plays a whole dongle. Node division, the reply filter, the per-modem semaphore between two
// processes and the one-port hand-over (its 10 s and 5 s waits run under the time seam, in a
// child run of this same program).
#include "vornwireless/usbmodem_lib/usbmodem_devicenodehandler.h"

#include <dlfcn.h>
#include <fcntl.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <termios.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <cstdlib>
#include <cstring>
#include <map>
#include <memory>
#include <mutex>
#include <thread>
#include <vector>

#include <json/json.h>

#include "support/syslog_capture.h"
#include "support/test_util.h"
#include "vornwireless/semaphore/semaphore.h"
#include "vornwireless/usbmodem_lib/usbmodem_atif.h"

using vornwireless::usbmodem_lib::USBModem_ATIF;
using vornwireless::usbmodem_lib::USBModem_DeviceNodeHandler;
using vorntest::LogLine;
using vorntest::SyslogCapture;

namespace vornwireless {
namespace usbmodem_lib {

// Reads the handler's node division and runs its reply filter directly.
class USBModem_DeviceNodeHandlerTestPeer {
 public:
  explicit USBModem_DeviceNodeHandlerTestPeer(USBModem_DeviceNodeHandler& h) : h_(h) {}
  std::vector<std::string> Nodes() const { return h_._nodes; }
  std::string QueryNode() const { return h_._queryNode; }
  std::string ConnectNode() const { return h_._connectNode; }
  bool MultiNode() const { return h_._multiNode; }
  bool DeviceOpen() const { return h_._modem != nullptr; }
  int OpenFileDevice(std::string const& node) { return h_.OpenFileDevice(node); }
  void CloseFileDevice() { h_.CloseFileDevice(); }
  int ModemCmd(std::string const& cmd, std::string& reply) { return h_.ModemCmd(cmd, reply); }

 private:
  USBModem_DeviceNodeHandler& h_;
};

}  // namespace usbmodem_lib
}  // namespace vornwireless

// The handler's settle pauses are sleep() calls: this program's own sleep() records each pause
// and then sleeps for real (under the time seam, in faked time). Tests assert on the pauses taken,
// never on how long real time took.
namespace {
std::mutex gPausesMutex;
std::vector<unsigned int> gPauses;
}  // namespace

extern "C" unsigned int sleep(unsigned int seconds) {
  {
    std::lock_guard<std::mutex> hold(gPausesMutex);
    gPauses.push_back(seconds);
  }
  using SleepFn = unsigned int (*)(unsigned int);
  static SleepFn const next = reinterpret_cast<SleepFn>(dlsym(RTLD_NEXT, "sleep"));
  return next(seconds);
}

using vornwireless::usbmodem_lib::USBModem_DeviceNodeHandlerTestPeer;

namespace {

const char kFile[] = "usbmodem_lib/usbmodem_devicenodehandler.cpp";
const char kReady[] = "\r\n+CPIN: READY\r\n\r\nOK\r\n";
const char kChildEnv[] = "VORN_NODEHANDLER_TIMEWARP_CHILD";

// The pauses (in seconds) taken since the last call.
std::vector<unsigned int> TakePauses() {
  std::lock_guard<std::mutex> hold(gPausesMutex);
  std::vector<unsigned int> taken;
  taken.swap(gPauses);
  return taken;
}
const std::vector<unsigned int> kNoPause;

double Seconds(std::chrono::steady_clock::time_point since) {
  return std::chrono::duration<double>(std::chrono::steady_clock::now() - since).count();
}

// One serial node of a dongle: a PTY whose slave side is linked at the node path. A thread answers
// on the master side like a modem: it echoes what it gets (when echo is on), and answers every
// command ended by a carriage return from its reply table.
class FakeNode {
 public:
  explicit FakeNode(std::string const& path) : path_(path) {
    master_ = posix_openpt(O_RDWR | O_NOCTTY);
    EXPECT_GE(master_, 0);
    EXPECT_EQ(0, grantpt(master_));
    EXPECT_EQ(0, unlockpt(master_));
    slave_path_ = ptsname(master_);
    // Holding the slave open keeps the line from hanging up between two users.
    slave_ = open(slave_path_.c_str(), O_RDWR | O_NOCTTY);
    EXPECT_GE(slave_, 0);
    // A serial line: raw, no echo by the line discipline (the modem's own echo is ours to make).
    struct termios t;
    EXPECT_EQ(0, tcgetattr(slave_, &t));
    cfmakeraw(&t);
    EXPECT_EQ(0, tcsetattr(slave_, TCSANOW, &t));
    unlink(path_.c_str());
    EXPECT_EQ(0, symlink(slave_path_.c_str(), path_.c_str())) << path_;
    replies_["AT+CPIN?"] = kReady;
  }
  ~FakeNode() {
    Stop();
    unlink(path_.c_str());
    close(slave_);
    if (master_ >= 0) close(master_);
  }
  // The dongle is pulled: the master side goes away and the slave side hangs up.
  void Unplug() {
    Stop();
    unlink(path_.c_str());
    close(master_);
    master_ = -1;
  }
  FakeNode(FakeNode const&) = delete;
  FakeNode& operator=(FakeNode const&) = delete;

  void Start() {
    stop_ = false;
    thread_ = std::thread([this] { Loop(); });
  }
  void Stop() {
    if (!thread_.joinable()) return;
    stop_ = true;
    thread_.join();
  }
  void SetReply(std::string const& cmd, std::string const& raw) {
    std::lock_guard<std::mutex> lock(mu_);
    replies_[cmd] = raw;
  }
  void SetSilent(bool silent) { silent_ = silent; }
  void SetEcho(bool echo) { echo_ = echo; }
  // After its next reply the node path goes away, as when the dongle drops a port.
  void SetVanishAfterReply(bool vanish) { vanish_ = vanish; }
  // The next n replies are cut after their first line, with no carriage return.
  void SetUnterminated(int n) { unterminated_ = n; }
  std::vector<std::string> Commands() {
    std::lock_guard<std::mutex> lock(mu_);
    return commands_;
  }
  size_t BytesReceived() { return bytes_; }
  std::string const& path() const { return path_; }
  int master() const { return master_; }

 private:
  void Loop() {
    std::string buffer;
    while (!stop_) {
      struct pollfd p = {master_, POLLIN, 0};
      if (poll(&p, 1, 20) <= 0 || !(p.revents & POLLIN)) continue;
      char data[512];
      ssize_t n = read(master_, data, sizeof(data));
      if (n <= 0) continue;
      bytes_ += n;
      if (echo_ && !silent_) Write(std::string(data, n));
      buffer.append(data, n);
      std::string::size_type cr;
      while ((cr = buffer.find('\r')) != std::string::npos) {
        std::string line = buffer.substr(0, cr);
        buffer.erase(0, cr + 1);
        if (line.empty()) continue;
        std::string reply;
        {
          std::lock_guard<std::mutex> lock(mu_);
          commands_.push_back(line);
          std::map<std::string, std::string>::const_iterator it = replies_.find(line);
          reply = it == replies_.end() ? "\r\nERROR\r\n" : it->second;
        }
        if (silent_) continue;
        if (unterminated_ > 0) {
          --unterminated_;
          std::string::size_type end = reply.find('\r', 2);
          reply = reply.substr(0, end);
        }
        Write(reply);
        if (vanish_) unlink(path_.c_str());
      }
    }
  }
  void Write(std::string const& s) {
    if (s.empty()) return;
    EXPECT_EQ(static_cast<ssize_t>(s.size()), write(master_, s.data(), s.size()));
  }

  std::string path_;
  std::string slave_path_;
  int master_ = -1;
  int slave_ = -1;
  std::thread thread_;
  std::atomic<bool> stop_{false};
  std::atomic<bool> silent_{false};
  std::atomic<bool> echo_{true};
  std::atomic<bool> vanish_{false};
  std::atomic<int> unterminated_{0};
  std::atomic<size_t> bytes_{0};
  std::mutex mu_;
  std::map<std::string, std::string> replies_;
  std::vector<std::string> commands_;
};

// A dongle: its information file /tmp/usbmodem.info<id> and its nodes under /tmp/dongle<id>/.
class Dongle {
 public:
  Dongle(unsigned int id, int nodeCount) : id_(id) {
    dir_ = "/tmp/dongle" + std::to_string(id);
    mkdir(dir_.c_str(), 0755);
    info_ = "/tmp/usbmodem.info" + std::to_string(id);
    keys_["USB_VENDOR"] = "1234";
    keys_["USB_PRODUCT"] = "5678";
    keys_["DEVICENODE_PREFIX"] = dir_ + "/ttyUSB";
    std::string list;
    for (int i = 0; i < nodeCount; ++i) {
      nodes_.emplace_back(new FakeNode(Node(i)));
      list += (i ? "," : "") + std::to_string(i);
    }
    keys_["DEVICENODE"] = list;
    WriteInfo();
  }
  ~Dongle() {
    nodes_.clear();
    unlink(info_.c_str());
    rmdir(dir_.c_str());
  }
  void Set(std::string const& key, std::string const& value) {
    keys_[key] = value;
    WriteInfo();
  }
  void Erase(std::string const& key) {
    keys_.erase(key);
    WriteInfo();
  }
  void StartAll() {
    for (auto& n : nodes_) n->Start();
  }
  void StopAll() {
    for (auto& n : nodes_) n->Stop();
  }
  std::string Node(int i) const { return dir_ + "/ttyUSB" + std::to_string(i); }
  FakeNode& operator[](int i) { return *nodes_[i]; }
  std::string const& info() const { return info_; }
  unsigned int id() const { return id_; }

 private:
  void WriteInfo() {
    std::string text;
    for (auto const& kv : keys_) text += kv.first + "=" + kv.second + "\n";
    ASSERT_TRUE(vorntest::WriteFile(info_, text));
  }
  unsigned int id_;
  std::string dir_;
  std::string info_;
  std::map<std::string, std::string> keys_;
  std::vector<std::unique_ptr<FakeNode>> nodes_;
};

int Count(std::vector<std::string> const& v, std::string const& s) {
  int n = 0;
  for (auto const& x : v) n += x == s;
  return n;
}

}  // namespace

// ---------------------------------------------------------------------------------------------
// Set-up from the information file.

TEST(DeviceNodeHandler, InitFailsWithoutInfoFile) {
  SyslogCapture log;
  USBModem_DeviceNodeHandler h(40);
  EXPECT_EQ(-1, h.InitHandler("/tmp/usbmodem.info40", "AT+CPIN?"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "failed to setup device node, usbmodem info not exist (/tmp/usbmodem.info40)")))
      << log.Dump();
}

TEST(DeviceNodeHandler, InitFailsWithEmptyQueryCommand) {
  Dongle d(41, 1);
  SyslogCapture log;
  USBModem_DeviceNodeHandler h(d.id());
  EXPECT_EQ(-1, h.InitHandler(d.info(), ""));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "failed to setup device node, query command is empty")))
      << log.Dump();
  EXPECT_TRUE(d[0].Commands().empty());
}

TEST(DeviceNodeHandler, InitFailsWithoutPrefix) {
  Dongle d(42, 1);
  d.Erase("DEVICENODE_PREFIX");
  SyslogCapture log;
  USBModem_DeviceNodeHandler h(d.id());
  EXPECT_EQ(-1, h.InitHandler(d.info(), "AT+CPIN?"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Cannot find DEVICENODE_PREFIX in file [" + d.info() + "]")))
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "failed to list device nodes"))) << log.Dump();
}

TEST(DeviceNodeHandler, NodeListIsAskedThreeTimesWithoutDelay) {
  Dongle d(43, 1);
  d.Erase("DEVICENODE");
  SyslogCapture log;
  USBModem_DeviceNodeHandler h(d.id());
  TakePauses();
  EXPECT_EQ(-1, h.InitHandler(d.info(), "AT+CPIN?"));
  EXPECT_EQ(kNoPause, TakePauses());
  for (int i = 1; i <= 3; ++i) {
    EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "No respond on setting device node list, wait 1 sec [" +
                                                        std::to_string(i) + "]")))
        << log.Dump();
  }
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "error on parsing DEVICENODE from " + d.info()))) << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "failed to list device nodes"))) << log.Dump();
}

TEST(DeviceNodeHandler, OnePortDongleProbesAndAssignsNothingYet) {
  Dongle d(44, 1);
  d.StartAll();
  USBModem_DeviceNodeHandler h(d.id());
  USBModem_DeviceNodeHandlerTestPeer peer(h);
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  EXPECT_EQ(std::vector<std::string>{"AT+CPIN?"}, d[0].Commands());
  EXPECT_FALSE(peer.MultiNode());
  EXPECT_EQ(std::vector<std::string>{d.Node(0)}, peer.Nodes());
  EXPECT_EQ("", peer.QueryNode());
  EXPECT_EQ("", peer.ConnectNode());
  EXPECT_FALSE(peer.DeviceOpen());  // the probe closed it again
}

TEST(DeviceNodeHandler, FirstCommandOpensTheQueryNodeAndFiltersTheReply) {
  Dongle d(45, 1);
  d[0].SetReply("AT+CGMI", "\r\nExample Mobile\r\n\r\nOK\r\n");
  d.StartAll();
  USBModem_DeviceNodeHandler h(d.id());
  USBModem_DeviceNodeHandlerTestPeer peer(h);
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  std::string reply = "stale";
  ASSERT_EQ(0, h.SendCommand("AT+CGMI", reply));
  EXPECT_EQ("Example Mobile\nOK\n", reply);  // no echo, no blank lines, line feeds only
  EXPECT_EQ(d.Node(0), peer.QueryNode());
  EXPECT_TRUE(peer.Nodes().empty());
  EXPECT_TRUE(peer.DeviceOpen());
  ASSERT_EQ(0, h.SendCommand("AT+CPIN?", reply));
  EXPECT_EQ("+CPIN: READY\nOK\n", reply);
  EXPECT_EQ((std::vector<std::string>{"AT+CPIN?", "AT+CGMI", "AT+CPIN?"}), d[0].Commands());
}

TEST(DeviceNodeHandler, ReplyWithoutEchoIsTheSame) {
  Dongle d(46, 1);
  d[0].SetEcho(false);
  d.StartAll();
  USBModem_DeviceNodeHandler h(d.id());
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  std::string reply;
  ASSERT_EQ(0, h.SendCommand("AT+CPIN?", reply));
  EXPECT_EQ("+CPIN: READY\nOK\n", reply);
}

TEST(DeviceNodeHandler, EachCommandIsPrecededByFiveCarriageReturns) {
  Dongle d(47, 1);
  d.StartAll();
  USBModem_DeviceNodeHandler h(d.id());
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  std::string reply;
  ASSERT_EQ(0, h.SendCommand("AT", reply));  // opens the query node
  size_t before = d[0].BytesReceived();
  ASSERT_EQ(0, h.SendCommand("AT+CSQ", reply));
  // "\r\r\r\r\r" to drain, then "AT+CSQ\r".
  EXPECT_EQ(5u + 7u, d[0].BytesReceived() - before);
  EXPECT_EQ("ERROR\n", reply);  // the fake knows no AT+CSQ: the filter still passes the answer
}

TEST(DeviceNodeHandler, StaleOutputIsDrainedBeforeTheCommand) {
  Dongle d(48, 1);
  d[0].SetEcho(false);
  d[0].SetReply("AT+CSQ", "\r\n+CSQ: 20,99\r\n\r\nOK\r\n");
  d.StartAll();
  USBModem_DeviceNodeHandler h(d.id());
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  std::string reply;
  ASSERT_EQ(0, h.SendCommand("AT+CSQ", reply));
  // An unsolicited report arrives between two commands; the next command must not see it.
  const char report[] = "\r\n^RSSI: 17\r\n";
  ASSERT_EQ(static_cast<ssize_t>(strlen(report)), write(d[0].master(), report, strlen(report)));
  usleep(50 * 1000);
  ASSERT_EQ(0, h.SendCommand("AT+CSQ", reply));
  EXPECT_EQ("+CSQ: 20,99\nOK\n", reply);
}

TEST(DeviceNodeHandler, FilterStopsAtTheFirstEmptyLine) {
  Dongle d(49, 1);
  d[0].SetReply("AT+CGMM", "\r\nE3372\r\n\nOK\r\n");
  d.StartAll();
  USBModem_DeviceNodeHandler h(d.id());
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  std::string reply;
  ASSERT_EQ(0, h.SendCommand("AT+CGMM", reply));
  EXPECT_EQ("E3372\n", reply);
}

TEST(DeviceNodeHandler, SilentNodeIsDroppedAndCommandsReadAsMute) {
  Dongle d(50, 1);
  d[0].SetSilent(true);
  d.StartAll();
  SyslogCapture log;
  USBModem_DeviceNodeHandler h(d.id());
  USBModem_DeviceNodeHandlerTestPeer peer(h);
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "No respond on modem cmd AT+CPIN?"))) << log.Dump();
  EXPECT_TRUE(peer.Nodes().empty());
  EXPECT_FALSE(peer.DeviceOpen());
  size_t before = d[0].BytesReceived();
  std::string reply = "stale";
  EXPECT_EQ(0, h.SendCommand("AT+CPIN?", reply));
  EXPECT_EQ("", reply);  // the SIM handler reads an empty reply as mute
  USBModem_ATIF at;
  EXPECT_EQ(0, at.ParseRetStringIsOK("OK\n"));
  EXPECT_EQ(before, d[0].BytesReceived());  // nothing was written
}

TEST(DeviceNodeHandler, SilentNodeAmongAnsweringOnesIsLeftOut) {
  Dongle d(51, 3);
  d[1].SetSilent(true);
  d.StartAll();
  USBModem_DeviceNodeHandler h(d.id());
  USBModem_DeviceNodeHandlerTestPeer peer(h);
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  EXPECT_TRUE(peer.MultiNode());
  EXPECT_EQ(d.Node(0), peer.ConnectNode());
  EXPECT_EQ(d.Node(2), peer.QueryNode());
  EXPECT_TRUE(peer.Nodes().empty());
}

TEST(DeviceNodeHandler, MissingNodeIsDropped) {
  Dongle d(52, 1);
  d.Set("DEVICENODE", "0,7");
  d.StartAll();
  SyslogCapture log;
  USBModem_DeviceNodeHandler h(d.id());
  USBModem_DeviceNodeHandlerTestPeer peer(h);
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  EXPECT_EQ(std::vector<std::string>{d.Node(0)}, peer.Nodes());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "modem Init failed: No such file or directory"))) << log.Dump();
}

TEST(DeviceNodeHandler, BusyNodeDelaysTheWholeInit) {
  Dongle d(53, 2);
  d[1].SetReply("AT+CPIN?", "\r\n+CME ERROR: SIM busy\r\n");  // found whatever its case
  d.StartAll();
  SyslogCapture log;
  USBModem_DeviceNodeHandler h(d.id());
  USBModem_DeviceNodeHandlerTestPeer peer(h);
  EXPECT_EQ(-1, h.InitHandler(d.info(), "AT+CPIN?"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Busy detected when testing node (" + d.Node(1) +
                                                      "), delay the init")))
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "failed to list device nodes"))) << log.Dump();
  EXPECT_FALSE(peer.DeviceOpen());

  // The next tick builds a new handler; the SIM is no longer busy.
  d[1].SetReply("AT+CPIN?", kReady);
  USBModem_DeviceNodeHandler again(d.id());
  USBModem_DeviceNodeHandlerTestPeer peer2(again);
  ASSERT_EQ(0, again.InitHandler(d.info(), "AT+CPIN?"));
  EXPECT_EQ(d.Node(0), peer2.ConnectNode());
  EXPECT_EQ(d.Node(1), peer2.QueryNode());
}

TEST(DeviceNodeHandler, RetryTimesNeedVendorAndProduct) {
  Dongle d(54, 1);
  d.Erase("USB_PRODUCT");
  d.StartAll();
  SyslogCapture log;
  USBModem_DeviceNodeHandler h(d.id());
  USBModem_DeviceNodeHandlerTestPeer peer(h);
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  EXPECT_TRUE(peer.Nodes().empty());  // the node could not be tested
  EXPECT_TRUE(d[0].Commands().empty());
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to get USB_PRODUCT from file " + d.info() + ".")))
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to get modem cmd trying attemps."))) << log.Dump();

  d.Erase("USB_VENDOR");
  log.Clear();
  USBModem_DeviceNodeHandler h2(d.id());
  ASSERT_EQ(0, h2.InitHandler(d.info(), "AT+CPIN?"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to get USB_VENDOR from file " + d.info() + ".")))
      << log.Dump();
}

TEST(DeviceNodeHandler, BuggyDongleIsTriedThreeTimes) {
  Dongle d(55, 1);
  d.Set("USB_VENDOR", "12d1");
  d.Set("USB_PRODUCT", "1506");
  d[0].SetUnterminated(2);
  d.StartAll();
  SyslogCapture log;
  USBModem_DeviceNodeHandler h(d.id());
  USBModem_DeviceNodeHandlerTestPeer peer(h);
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  EXPECT_EQ(3, Count(d[0].Commands(), "AT+CPIN?"));
  EXPECT_EQ(std::vector<std::string>{d.Node(0)}, peer.Nodes());
  EXPECT_EQ(2u, log.Matching(LogLine(kFile, "Do workround that retries modem command for the buggy 3G-LTE dongle.")).size())
      << log.Dump();
  for (auto const& line : log.Matching("Do workround")) EXPECT_EQ(LOG_INFO, line.level);
}

TEST(DeviceNodeHandler, BuggyDongleGivesUpAfterThreeCutLines) {
  Dongle d(56, 1);
  d.Set("USB_VENDOR", "12d1");
  d.Set("USB_PRODUCT", "1506abc");  // four characters are compared
  d[0].SetUnterminated(3);
  d.StartAll();
  USBModem_DeviceNodeHandler h(d.id());
  USBModem_DeviceNodeHandlerTestPeer peer(h);
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  EXPECT_EQ(3, Count(d[0].Commands(), "AT+CPIN?"));
  EXPECT_TRUE(peer.Nodes().empty());
}

TEST(DeviceNodeHandler, OtherDonglesAreTriedOnce) {
  for (auto const& ids : std::vector<std::pair<std::string, std::string>>{
           {"12d1", "1001"}, {"1234", "1506"}, {"2001", "7d01"}}) {
    Dongle d(57, 1);
    d.Set("USB_VENDOR", ids.first);
    d.Set("USB_PRODUCT", ids.second);
    d[0].SetUnterminated(1);
    d.StartAll();
    SyslogCapture log;
    USBModem_DeviceNodeHandler h(d.id());
    USBModem_DeviceNodeHandlerTestPeer peer(h);
    ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
    EXPECT_EQ(1, Count(d[0].Commands(), "AT+CPIN?")) << ids.first << ":" << ids.second;
    EXPECT_TRUE(peer.Nodes().empty()) << ids.first << ":" << ids.second;
    EXPECT_TRUE(log.HasOnce(LOG_INFO, LogLine(kFile, "Do workround that retries modem command for the buggy 3G-LTE dongle.")))
        << log.Dump();
  }
}

TEST(DeviceNodeHandler, CutOffLineGivesMinusTwoAndKeepsThePartialReply) {
  Dongle d(58, 1);
  d[0].SetReply("AT+CGMI", "\r\nExample\r\n\r\nOK\r\n");
  d[0].SetReply("AT+CSQ", "\r\n+CSQ: 20,99\r\n+CSQ: 2");
  d.StartAll();
  USBModem_DeviceNodeHandler h(d.id());
  USBModem_DeviceNodeHandlerTestPeer peer(h);
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  ASSERT_EQ(0, peer.OpenFileDevice(d.Node(0)));
  std::string reply;
  EXPECT_EQ(-2, peer.ModemCmd("AT+CSQ", reply));
  EXPECT_EQ("+CSQ: 20,99\n", reply);
  peer.CloseFileDevice();
}

TEST(DeviceNodeHandler, SendCommandTreatsACutLineAsFailureAndReopensNextTime) {
  Dongle d(59, 1);
  d.StartAll();
  SyslogCapture log;
  USBModem_DeviceNodeHandler h(d.id());
  USBModem_DeviceNodeHandlerTestPeer peer(h);
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  d[0].SetUnterminated(1);
  std::string reply;
  EXPECT_EQ(-1, h.SendCommand("AT+CPIN?", reply));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "failed to send modem cmd"))) << log.Dump();
  EXPECT_EQ("", peer.QueryNode());  // the node went back to the free ones
  EXPECT_EQ(std::vector<std::string>{d.Node(0)}, peer.Nodes());
  EXPECT_FALSE(peer.DeviceOpen());
  ASSERT_EQ(0, h.SendCommand("AT+CPIN?", reply));
  EXPECT_EQ("+CPIN: READY\nOK\n", reply);
  EXPECT_EQ(d.Node(0), peer.QueryNode());
}

TEST(DeviceNodeHandler, NodeThatNoLongerAnswersIsClosedAndRetriedOnTheNextCommand) {
  Dongle d(60, 1);
  d.StartAll();
  SyslogCapture log;
  USBModem_DeviceNodeHandler h(d.id());
  USBModem_DeviceNodeHandlerTestPeer peer(h);
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  std::string reply;
  ASSERT_EQ(0, h.SendCommand("AT+CPIN?", reply));
  d[0].SetSilent(true);
  EXPECT_EQ(-1, h.SendCommand("AT+CGMI", reply));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "No respond on modem cmd AT+CGMI"))) << log.Dump();
  EXPECT_FALSE(peer.DeviceOpen());
  d[0].SetSilent(false);
  ASSERT_EQ(0, h.SendCommand("AT+CPIN?", reply));
  EXPECT_EQ("+CPIN: READY\nOK\n", reply);
}

TEST(DeviceNodeHandler, UnpluggedNodeFailsTheCommand) {
  Dongle d(78, 1);
  d.StartAll();
  SyslogCapture log;
  USBModem_DeviceNodeHandler h(d.id());
  USBModem_DeviceNodeHandlerTestPeer peer(h);
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  std::string reply;
  ASSERT_EQ(0, h.SendCommand("AT+CPIN?", reply));
  d[0].Unplug();
  reply = "keep";
  EXPECT_EQ(-1, h.SendCommand("AT+CPIN?", reply));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "No respond on modem cmd AT+CPIN?"))) << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "failed to send modem cmd"))) << log.Dump();
  EXPECT_FALSE(peer.DeviceOpen());
  // The node is gone for good: the next command cannot open it.
  EXPECT_EQ(-1, h.SendCommand("AT+CPIN?", reply));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "failed to setup query node"))) << log.Dump();
}

TEST(DeviceNodeHandler, QueryNodeThatCannotBeOpenedFailsTheCommand) {
  Dongle d(61, 1);
  d.StartAll();
  SyslogCapture log;
  USBModem_DeviceNodeHandler h(d.id());
  USBModem_DeviceNodeHandlerTestPeer peer(h);
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  // Another program holds the node (its lock file says so).
  USBModem_DeviceNodeHandler other(99);
  USBModem_DeviceNodeHandlerTestPeer otherPeer(other);
  ASSERT_EQ(0, otherPeer.OpenFileDevice(d.Node(0)));
  std::string reply;
  EXPECT_EQ(-1, h.SendCommand("AT+CPIN?", reply));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "modem Init failed: Device or resource busy"))) << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "failed to assign query node"))) << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "failed to setup query node"))) << log.Dump();
  EXPECT_EQ(std::vector<std::string>{d.Node(0)}, peer.Nodes());
  otherPeer.CloseFileDevice();
  ASSERT_EQ(0, h.SendCommand("AT+CPIN?", reply));
  EXPECT_EQ("+CPIN: READY\nOK\n", reply);
}

TEST(DeviceNodeHandler, DestructorClosesTheQueryNode) {
  Dongle d(62, 1);
  d.StartAll();
  {
    USBModem_DeviceNodeHandler h(d.id());
    ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
    std::string reply;
    ASSERT_EQ(0, h.SendCommand("AT+CPIN?", reply));
    USBModem_DeviceNodeHandler probe(98);
    USBModem_DeviceNodeHandlerTestPeer probePeer(probe);
    EXPECT_EQ(-1, probePeer.OpenFileDevice(d.Node(0)));  // held by h
  }
  USBModem_DeviceNodeHandler probe(98);
  USBModem_DeviceNodeHandlerTestPeer probePeer(probe);
  EXPECT_EQ(0, probePeer.OpenFileDevice(d.Node(0)));
  probePeer.CloseFileDevice();
}

TEST(DeviceNodeHandler, CommandHoldingALineBreakIsRefusedBeforeAnythingIsSent) {
  Dongle d(63, 1);
  d.StartAll();
  SyslogCapture log;
  USBModem_DeviceNodeHandler h(d.id());
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  std::string reply;
  ASSERT_EQ(0, h.SendCommand("AT", reply));
  size_t before = d[0].BytesReceived();
  reply = "keep";
  EXPECT_EQ(-1, h.SendCommand("AT+CPIN=1234\rAT+CLCK=\"SC\",0,\"1234\"", reply));
  EXPECT_EQ(-1, h.SendCommand("AT+CPIN=1234\n", reply));
  EXPECT_EQ(-1, h.SendCommand(std::string("AT+CPIN=12\0" "34", 14), reply));
  EXPECT_EQ(-1, h.SendCommand("AT+CPIN=\x1b" "1234", reply));
  EXPECT_EQ("keep", reply);
  usleep(100 * 1000);
  EXPECT_EQ(before, d[0].BytesReceived());
  EXPECT_EQ(4u, log.Matching(LogLine(kFile, "Refuse modem cmd holding a control character")).size()) << log.Dump();
  // A quoted argument is fine.
  EXPECT_EQ(0, h.SendCommand("AT+CLCK=\"SC\",2", reply));
}

TEST(DeviceNodeHandler, EmptyCommandFailsOnAnOpenNode) {
  Dongle d(64, 1);
  d.StartAll();
  SyslogCapture log;
  USBModem_DeviceNodeHandler h(d.id());
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  std::string reply;
  EXPECT_EQ(-1, h.SendCommand("", reply));  // the base dialect has no unsolicited-report command
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Error on executing modem cmd with a null modem or null command")))
      << log.Dump();
  EXPECT_EQ(1u, d[0].Commands().size());  // only the probe
}

// ---------------------------------------------------------------------------------------------
// Node division of multi-node dongles.

TEST(DeviceNodeHandler, MultiNodeDongleSplitsConnectAndQueryNodeAtInit) {
  Dongle d(65, 2);
  d[1].SetReply("AT+CGMI", "\r\nExample\r\n\r\nOK\r\n");
  d.StartAll();
  USBModem_DeviceNodeHandler h(d.id());
  USBModem_DeviceNodeHandlerTestPeer peer(h);
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  EXPECT_TRUE(peer.MultiNode());
  EXPECT_EQ(d.Node(0), peer.ConnectNode());
  EXPECT_EQ(d.Node(1), peer.QueryNode());
  EXPECT_TRUE(peer.DeviceOpen());
  std::string reply;
  ASSERT_EQ(0, h.SendCommand("AT+CGMI", reply));
  EXPECT_EQ("Example\nOK\n", reply);
  EXPECT_EQ(std::vector<std::string>{"AT+CPIN?"}, d[0].Commands());
  EXPECT_EQ((std::vector<std::string>{"AT+CPIN?", "AT+CGMI"}), d[1].Commands());

  // Connecting takes no pause and keeps the query node; the connect node is kept for ever.
  std::string node;
  TakePauses();
  EXPECT_EQ(0, h.GetConnectNode(node));
  EXPECT_EQ(d.Node(0), node);
  h.ReleaseConnectNode();
  EXPECT_EQ(kNoPause, TakePauses());
  EXPECT_EQ(d.Node(0), peer.ConnectNode());
  EXPECT_EQ(d.Node(1), peer.QueryNode());
  ASSERT_EQ(0, h.SendCommand("AT+CPIN?", reply));
  EXPECT_EQ("+CPIN: READY\nOK\n", reply);
}

TEST(DeviceNodeHandler, ConnectNodeFromTheInfoFile) {
  Dongle d(66, 3);
  d.Set("CONNECTNODE", "2");
  d.StartAll();
  USBModem_DeviceNodeHandler h(d.id());
  USBModem_DeviceNodeHandlerTestPeer peer(h);
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  EXPECT_EQ(d.Node(2), peer.ConnectNode());
  EXPECT_EQ(d.Node(0), peer.QueryNode());
  EXPECT_EQ(std::vector<std::string>{d.Node(1)}, peer.Nodes());
  std::string node;
  EXPECT_EQ(0, h.GetConnectNode(node));
  EXPECT_EQ(d.Node(2), node);
}

TEST(DeviceNodeHandler, MultiNodeDongleFailsWhenTheConnectNodeDidNotAnswer) {
  Dongle d(67, 3);
  d.Set("CONNECTNODE", "1");
  d[1].SetSilent(true);
  d.StartAll();
  SyslogCapture log;
  USBModem_DeviceNodeHandler h(d.id());
  EXPECT_EQ(-1, h.InitHandler(d.info(), "AT+CPIN?"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Connection node is not in the list"))) << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "failed to init connect node for multi-node device")))
      << log.Dump();
}

TEST(DeviceNodeHandler, MultiNodeDongleFailsWhenNoQueryNodeOpens) {
  Dongle d(68, 2);
  d[1].SetVanishAfterReply(true);  // answers the probe, then its node is gone
  d.StartAll();
  SyslogCapture log;
  USBModem_DeviceNodeHandler h(d.id());
  USBModem_DeviceNodeHandlerTestPeer peer(h);
  EXPECT_EQ(-1, h.InitHandler(d.info(), "AT+CPIN?"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "failed to assign query node"))) << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "failed to init query node for multi-node device")))
      << log.Dump();
  EXPECT_EQ(d.Node(0), peer.ConnectNode());
  EXPECT_EQ(std::vector<std::string>{d.Node(1)}, peer.Nodes());
  EXPECT_FALSE(peer.DeviceOpen());
}

TEST(DeviceNodeHandler, NoNodeAtAllGivesNoConnectNode) {
  Dongle d(69, 1);
  d[0].SetSilent(true);
  d.StartAll();
  SyslogCapture log;
  USBModem_DeviceNodeHandler h(d.id());
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  std::string node = "keep";
  EXPECT_EQ(0, h.GetConnectNode(node));
  EXPECT_EQ("keep", node);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Cannot get connection node"))) << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "failed on parsing connect device node"))) << log.Dump();
}

// ---------------------------------------------------------------------------------------------
// One-port dongle: the steps around the waits (no query node open, so no pause is due).

TEST(DeviceNodeHandler, OnePortDongleAtRestLendsItsNodeWithoutClosingAnything) {
  Dongle d(70, 1);
  d.StartAll();
  USBModem_DeviceNodeHandler h(d.id());
  USBModem_DeviceNodeHandlerTestPeer peer(h);
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  std::string node;
  TakePauses();
  EXPECT_EQ(0, h.GetConnectNode(node));
  EXPECT_EQ(kNoPause, TakePauses());
  EXPECT_EQ(d.Node(0), node);
  EXPECT_EQ(d.Node(0), peer.ConnectNode());
  EXPECT_TRUE(peer.Nodes().empty());
  // While the dialler has it, every command answers empty and nothing reaches the node.
  size_t before = d[0].BytesReceived();
  std::string reply = "stale";
  EXPECT_EQ(0, h.SendCommand("AT+CPIN?", reply));
  EXPECT_EQ("", reply);
  EXPECT_EQ(before, d[0].BytesReceived());
  // Asking again finds the same node (it is never lost between the lists).
  EXPECT_EQ(0, h.GetConnectNode(node));
  EXPECT_EQ(d.Node(0), node);
  EXPECT_TRUE(peer.Nodes().empty());
}

// ---------------------------------------------------------------------------------------------
// The semaphore keyed by the modem id, between two processes.

TEST(DeviceNodeHandler, SendCommandWaitsForTheSemaphoreHeldByAnotherProcess) {
  Dongle d(71, 1);
  d.StartAll();
  USBModem_DeviceNodeHandler h(d.id());
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  d.StopAll();  // no thread may run across fork(); this process answers by hand below

  vornwireless::semaphore::Semaphore held(d.id());
  ASSERT_EQ(0, held.Enter());
  pid_t child = fork();
  ASSERT_GE(child, 0);
  if (child == 0) {
    std::string reply;
    int r = h.SendCommand("AT+CGMI", reply);
    _exit(r == 0 ? 0 : 1);
  }
  // While the semaphore is held, nothing reaches the node and the child stays blocked.
  struct pollfd p = {d[0].master(), POLLIN, 0};
  EXPECT_EQ(0, poll(&p, 1, 700));
  int status = 0;
  EXPECT_EQ(0, waitpid(child, &status, WNOHANG));
  ASSERT_EQ(0, held.Release());
  // After the release the waiter goes on (or, when the semaphore was removed under it, gives
  // up) and ends. The minute is only the end of the wait, not a timing assertion.
  bool sawCommand = false;
  bool exited = false;
  std::string received;
  auto start = std::chrono::steady_clock::now();
  while (Seconds(start) < 60.0) {
    if (poll(&p, 1, 50) > 0 && (p.revents & POLLIN)) {
      char buf[256];
      ssize_t n = read(d[0].master(), buf, sizeof(buf));
      if (n > 0) received.append(buf, n);
      if (received.find("AT+CGMI\r") != std::string::npos && !sawCommand) {
        sawCommand = true;
        const char answer[] = "\r\nExample\r\n\r\nOK\r\n";
        ASSERT_EQ(static_cast<ssize_t>(strlen(answer)), write(d[0].master(), answer, strlen(answer)));
      }
    }
    if (waitpid(child, &status, WNOHANG) == child) {
      exited = true;
      break;
    }
  }
  if (!exited) {
    kill(child, SIGKILL);
    waitpid(child, &status, 0);
  }
  ASSERT_TRUE(exited) << "the waiter never went on after the release";
  EXPECT_TRUE(WIFEXITED(status));
  if (sawCommand) {
    EXPECT_EQ(0, WEXITSTATUS(status));
    EXPECT_EQ(0u, received.find("\r\r\r\r\r"));  // the drain came first, after the release
  }
}

TEST(DeviceNodeHandler, GetConnectNodeWaitsForTheSemaphoreToo) {
  Dongle d(72, 2);
  d.StartAll();
  USBModem_DeviceNodeHandler h(d.id());
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  d.StopAll();
  int fds[2];
  ASSERT_EQ(0, pipe(fds));
  vornwireless::semaphore::Semaphore held(d.id());
  ASSERT_EQ(0, held.Enter());
  pid_t child = fork();
  ASSERT_GE(child, 0);
  if (child == 0) {
    close(fds[0]);
    std::string node;
    h.GetConnectNode(node);
    ssize_t w = write(fds[1], node.data(), node.size());
    _exit(w == static_cast<ssize_t>(node.size()) ? 0 : 1);
  }
  close(fds[1]);
  struct pollfd p = {fds[0], POLLIN, 0};
  EXPECT_EQ(0, poll(&p, 1, 500));  // blocked while held
  // Our release hands the semaphore to the waiter, and then removes the set. A quick waiter may be
  // done and have removed the set itself first, so that our removal finds nothing: both orders
  // are how a remove-on-release semaphore behaves, and neither blocks anyone.
  held.Release();
  EXPECT_EQ(1, poll(&p, 1, 5000));
  char buf[256] = {0};
  ssize_t n = read(fds[0], buf, sizeof(buf) - 1);
  close(fds[0]);
  int status = 0;
  ASSERT_EQ(child, waitpid(child, &status, 0));
  EXPECT_TRUE(WIFEXITED(status));
  EXPECT_EQ(0, WEXITSTATUS(status));
  EXPECT_EQ(d.Node(0), std::string(buf, n > 0 ? n : 0));  // the result is the node all the same
}

// ---------------------------------------------------------------------------------------------
// The one-port hand-over with its real waits: run in a child of this program under the time seam
// (20 times faster), where the 10 s and 5 s pauses take half a second and a quarter.

class HandOverUnderTimeWarp : public ::testing::Test {
 protected:
  void SetUp() override {
    if (getenv(kChildEnv) == nullptr) GTEST_SKIP() << "runs in the time-warped child only";
  }
};

TEST_F(HandOverUnderTimeWarp, OnePortNodeGoesToTheDiallerAndComesBack) {
  Dongle d(73, 1);
  d.StartAll();
  USBModem_DeviceNodeHandler h(d.id());
  USBModem_DeviceNodeHandlerTestPeer peer(h);
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  std::string reply;
  ASSERT_EQ(0, h.SendCommand("AT+CPIN?", reply));
  ASSERT_EQ(d.Node(0), peer.QueryNode());
  ASSERT_TRUE(peer.DeviceOpen());

  std::string node;
  auto start = std::chrono::steady_clock::now();
  EXPECT_EQ(0, h.GetConnectNode(node));
  double took = Seconds(start);
  EXPECT_EQ(std::vector<unsigned int>{10}, TakePauses());  // one pause of 10 s, not two
  EXPECT_GE(took, 10.0);  // really waited, in faked time
  EXPECT_EQ(d.Node(0), node);
  EXPECT_EQ(d.Node(0), peer.ConnectNode());
  EXPECT_EQ("", peer.QueryNode());
  EXPECT_FALSE(peer.DeviceOpen());
  // The dialler can open it now.
  USBModem_DeviceNodeHandler dialler(96);
  USBModem_DeviceNodeHandlerTestPeer diallerPeer(dialler);
  EXPECT_EQ(0, diallerPeer.OpenFileDevice(node));
  diallerPeer.CloseFileDevice();

  size_t before = d[0].BytesReceived();
  reply = "stale";
  EXPECT_EQ(0, h.SendCommand("AT+CPIN?", reply));
  EXPECT_EQ("", reply);  // mute while dialling
  EXPECT_EQ(before, d[0].BytesReceived());

  TakePauses();
  start = std::chrono::steady_clock::now();
  h.ReleaseConnectNode();
  took = Seconds(start);
  EXPECT_EQ(std::vector<unsigned int>{5}, TakePauses());  // one pause of 5 s, not two
  EXPECT_GE(took, 5.0);
  EXPECT_EQ("", peer.ConnectNode());
  EXPECT_EQ(std::vector<std::string>{d.Node(0)}, peer.Nodes());
  ASSERT_EQ(0, h.SendCommand("AT+CPIN?", reply));
  EXPECT_EQ("+CPIN: READY\nOK\n", reply);
  EXPECT_EQ(d.Node(0), peer.QueryNode());

  // Released twice: nothing more happens and there is no second pause.
  h.ReleaseConnectNode();
  EXPECT_EQ(kNoPause, TakePauses());  // no second pause of 5 s
}

TEST_F(HandOverUnderTimeWarp, OnePortDongleFallsToItsQueryNodeWhenTheConnectNodeDidNotAnswer) {
  Dongle d(74, 2);
  d.Set("CONNECTNODE", "1");
  d[1].SetSilent(true);
  d.StartAll();
  SyslogCapture log;
  USBModem_DeviceNodeHandler h(d.id());
  USBModem_DeviceNodeHandlerTestPeer peer(h);
  ASSERT_EQ(0, h.InitHandler(d.info(), "AT+CPIN?"));
  EXPECT_FALSE(peer.MultiNode());
  std::string reply;
  ASSERT_EQ(0, h.SendCommand("AT+CPIN?", reply));
  std::string node;
  TakePauses();
  auto start = std::chrono::steady_clock::now();
  EXPECT_EQ(0, h.GetConnectNode(node));
  EXPECT_EQ(std::vector<unsigned int>{10}, TakePauses());
  EXPECT_GE(Seconds(start), 10.0);
  EXPECT_EQ(d.Node(0), node);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Connection node is not in the list"))) << log.Dump();
  EXPECT_EQ(0u, log.Matching("failed on parsing connect device node").size());
}

TEST(DeviceNodeHandler, HandOverRunsUnderTheTimeSeam) {
  if (getenv(kChildEnv) != nullptr) GTEST_SKIP() << "this is the child";
  std::string timewarp = vorntest::SourceDir() + "/tests/sandbox/vorn-timewarp";
  ASSERT_TRUE(vorntest::Exists(timewarp)) << timewarp;
  char self[4096] = {0};
  ASSERT_GT(readlink("/proc/self/exe", self, sizeof(self) - 1), 0);
  setenv(kChildEnv, "1", 1);
  auto start = std::chrono::steady_clock::now();
  vorntest::RunResult r = vorntest::Run(
      {timewarp, "5", "--", self, "--gtest_filter=HandOverUnderTimeWarp.*"}, "", 120);
  double took = Seconds(start);
  unsetenv(kChildEnv);
  EXPECT_EQ(0, r.status) << r.out << r.err;
  EXPECT_NE(std::string::npos, r.out.find("[  PASSED  ] 2 tests.")) << r.out << r.err;
  EXPECT_EQ(std::string::npos, r.out.find("SKIPPED")) << r.out;
  // 25 s of waits pass in a fraction of that: a figure, not a pass criterion.
  std::printf("hand-over tests under the time seam: %.1f s of wall time\n", took);
}

// ---------------------------------------------------------------------------------------------
// Against the modem simulator: a whole dongle with its dialect and its fault modes.

namespace {

class ModemSim {
 public:
  ModemSim(std::string const& scenario, unsigned int id) : id_(id) {
    std::string sim = vorntest::SourceDir() + "/tests/fixtures/modem-sim";
    available_ = vorntest::Exists(sim);
    if (!available_) return;
    scenario_ = "/tmp/modem-sim-scenario." + std::to_string(id) + ".json";
    transcript_ = "/tmp/modem-sim." + std::to_string(id) + ".transcript.jsonl";
    EXPECT_TRUE(vorntest::WriteFile(scenario_, scenario));
    int fds[2];
    EXPECT_EQ(0, pipe(fds));
    pid_ = fork();
    if (pid_ == 0) {
      close(fds[0]);
      std::string fd = std::to_string(fds[1]);
      std::string info = std::to_string(id);
      execl(sim.c_str(), sim.c_str(), scenario_.c_str(), "--info", info.c_str(), "--transcript",
            transcript_.c_str(), "--ready-fd", fd.c_str(), static_cast<char*>(nullptr));
      _exit(127);
    }
    close(fds[1]);
    struct pollfd p = {fds[0], POLLIN, 0};
    char buf[16] = {0};
    ready_ = poll(&p, 1, 10000) == 1 && read(fds[0], buf, sizeof(buf)) > 0 &&
             std::string(buf).find("ready") == 0;
    close(fds[0]);
  }
  ~ModemSim() {
    if (pid_ > 0) {
      kill(pid_, SIGTERM);
      int status = 0;
      waitpid(pid_, &status, 0);
    }
    unlink(scenario_.c_str());
  }
  bool available() const { return available_; }
  bool ready() const { return ready_; }
  std::string info() const { return "/tmp/usbmodem.info" + std::to_string(id_); }
  std::string transcript() const { return vorntest::ReadFile(transcript_); }
  // The nodes that received `cmd`, in the order of the transcript.
  std::vector<std::string> NodesOf(std::string const& cmd) const {
    std::vector<std::string> nodes;
    std::string text = transcript();
    std::string::size_type start = 0;
    while (start < text.size()) {
      std::string::size_type end = text.find('\n', start);
      if (end == std::string::npos) end = text.size();
      Json::Value rec;
      Json::Reader reader;
      if (reader.parse(text.substr(start, end - start), rec) && rec.isObject() &&
          rec.get("kind", "").asString() == "cmd" && rec.get("cmd", "").asString() == cmd) {
        nodes.push_back(rec.get("node", "").asString());
      }
      start = end + 1;
    }
    return nodes;
  }

 private:
  unsigned int id_;
  bool available_ = false;
  bool ready_ = false;
  pid_t pid_ = -1;
  std::string scenario_;
  std::string transcript_;
};

int CountOf(std::string const& text, std::string const& what) {
  int n = 0;
  for (std::string::size_type p = text.find(what); p != std::string::npos; p = text.find(what, p + 1)) ++n;
  return n;
}

}  // namespace

TEST(DeviceNodeHandlerSim, ThreeNodeDongleWithConnectNode) {
  ModemSim sim(R"({"vendor": "12d1", "product": "1001", "prefix": "/dev/ttyUSB",
                   "nodes": [{"name": "0"}, {"name": "1", "silent": true}, {"name": "2"}],
                   "connect_node": "0", "manufacturer": "simulated", "model": "SIM-1"})",
               75);
  ASSERT_TRUE(sim.available()) << "modem simulator not there";
  ASSERT_TRUE(sim.ready());
  USBModem_DeviceNodeHandler h(75);
  USBModem_DeviceNodeHandlerTestPeer peer(h);
  ASSERT_EQ(0, h.InitHandler(sim.info(), "AT+CPIN?"));
  EXPECT_TRUE(peer.MultiNode());
  EXPECT_EQ("/dev/ttyUSB0", peer.ConnectNode());
  EXPECT_EQ("/dev/ttyUSB2", peer.QueryNode());
  std::string reply;
  ASSERT_EQ(0, h.SendCommand("AT+CGMM", reply));
  EXPECT_EQ("SIM-1\nOK\n", reply);
  ASSERT_EQ(0, h.SendCommand("AT+CPIN?", reply));
  EXPECT_EQ("+CPIN: READY\nOK\n", reply);
  std::string node;
  EXPECT_EQ(0, h.GetConnectNode(node));
  EXPECT_EQ("/dev/ttyUSB0", node);
  // Every command after the probes went to the query node; the silent node was probed once.
  EXPECT_EQ((std::vector<std::string>{"/dev/ttyUSB2"}), sim.NodesOf("AT+CGMM")) << sim.transcript();
  EXPECT_EQ((std::vector<std::string>{"/dev/ttyUSB0", "/dev/ttyUSB1", "/dev/ttyUSB2", "/dev/ttyUSB2"}),
            sim.NodesOf("AT+CPIN?"))
      << sim.transcript();
}

TEST(DeviceNodeHandlerSim, BuggyDongleAnswersAfterItsCutLine) {
  ModemSim sim(R"({"vendor": "12d1", "product": "1506", "prefix": "/dev/ttyACM",
                   "nodes": [{"name": "0", "unterminated": 1}]})",
               76);
  ASSERT_TRUE(sim.available()) << "modem simulator not there";
  ASSERT_TRUE(sim.ready());
  SyslogCapture log;
  USBModem_DeviceNodeHandler h(76);
  USBModem_DeviceNodeHandlerTestPeer peer(h);
  ASSERT_EQ(0, h.InitHandler(sim.info(), "AT+CPIN?"));
  EXPECT_EQ(std::vector<std::string>{"/dev/ttyACM0"}, peer.Nodes());
  EXPECT_TRUE(log.HasOnce(LOG_INFO, LogLine(kFile, "Do workround that retries modem command for the buggy 3G-LTE dongle.")))
      << log.Dump();
  EXPECT_EQ(2, CountOf(sim.transcript(), "\"cmd\": \"AT+CPIN?\"")) << sim.transcript();
}

TEST(DeviceNodeHandlerSim, BusySimDelaysInit) {
  ModemSim sim(R"({"vendor": "2001", "product": "7d01", "prefix": "/dev/ttyUSB",
                   "nodes": [{"name": "3"}], "sim": {"state": "ready", "busy_queries": 1}})",
               77);
  ASSERT_TRUE(sim.available()) << "modem simulator not there";
  ASSERT_TRUE(sim.ready());
  SyslogCapture log;
  USBModem_DeviceNodeHandler h(77);
  EXPECT_EQ(-1, h.InitHandler(sim.info(), "AT+CPIN?"));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Busy detected when testing node (/dev/ttyUSB3), delay the init")))
      << log.Dump();
  USBModem_DeviceNodeHandler next(77);
  EXPECT_EQ(0, next.InitHandler(sim.info(), "AT+CPIN?"));
}
