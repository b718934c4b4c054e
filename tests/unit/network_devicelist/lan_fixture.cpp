// A bridged LAN with peer hosts for the device list tests.
#include "lan_fixture.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cctype>
#include <cstdlib>
#include <fstream>
#include <sstream>

#include "support/test_util.h"

namespace vorntest {

namespace {

std::string PeerPid(std::string const& veth) {
  std::string upper;
  for (char c : veth) upper += static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
  for (std::string const& name : {"VORN_PEER_" + veth + "_PID", "VORN_PEER_" + upper + "_PID"}) {
    char const* v = std::getenv(name.c_str());
    if (v != nullptr) return v;
  }
  return std::string();
}

bool IpStep(std::vector<std::string> const& args, std::string* why) {
  RunResult r = Ip(args);
  if (r.status == 0) return true;
  if (why != nullptr) {
    *why = "ip";
    for (auto const& a : args) *why += " " + a;
    *why += ": " + r.err;
  }
  return false;
}

}  // namespace

std::string PeerAddr(std::string const& veth) {
  char const* v = std::getenv(("VORN_PEER_" + veth + "_ADDR").c_str());
  return v != nullptr ? v : "";
}

bool SetUpRouterLan(std::string* why) {
  // No duplicate address detection: the UPnP library refuses a tentative link-local address.
  WriteFile("/proc/sys/net/ipv6/conf/default/accept_dad", "0");
  WriteFile("/proc/sys/net/ipv6/conf/all/accept_dad", "0");
  return IpStep({"link", "add", "br0", "type", "bridge", "stp_state", "0", "forward_delay", "0"},
                why) &&
         IpStep({"addr", "flush", "dev", "lan0"}, why) &&
         IpStep({"link", "set", "lan0", "master", "br0"}, why) &&
         IpStep({"addr", "add", "10.200.1.2/24", "dev", "br0"}, why) &&
         IpStep({"link", "set", "br0", "up"}, why) &&
         IpStep({"route", "replace", "default", "via", PeerAddr("eth0"), "dev", "eth0"}, why);
}

std::string PeerMac(std::string const& veth) {
  RunResult r = PeerIp(veth, {"-o", "link", "show", veth});
  if (r.status != 0) r = Run({"/usr/bin/nsenter", "-t", PeerPid(veth), "-n", "/usr/sbin/ip", "-o",
                             "link", "show", veth});
  std::istringstream in(r.out);
  std::string word;
  while (in >> word) {
    if (word == "link/ether" && (in >> word)) return word;
  }
  return std::string();
}

int PingOnce(std::string const& ip) {
  return Run({"/usr/bin/ping", "-c", "1", "-W", "2", "-n", "-q", ip}).status;
}

bool SetTopology(std::string const& topology) {
  return WriteFile("/etc/vorninfo.conf", "net_topology=\"" + topology + "\"\n");
}

std::string ArpLine(std::string const& ip) {
  std::istringstream in(ReadFile("/proc/net/arp"));
  std::string line;
  while (std::getline(in, line)) {
    if (line.compare(0, ip.size() + 1, ip + " ") == 0) return line;
  }
  return std::string();
}

PeerProcess::PeerProcess(std::string const& veth, std::vector<std::string> const& argv,
                         std::string const& readyText, int readySeconds) {
  char tmpl[] = "/tmp/peer-process-XXXXXX";
  int fd = mkstemp(tmpl);
  if (fd < 0) return;
  _log = tmpl;
  std::vector<std::string> full;
  if (!veth.empty()) full = {"/usr/bin/nsenter", "-t", PeerPid(veth), "-n"};
  full.insert(full.end(), argv.begin(), argv.end());
  _pid = fork();
  if (_pid == 0) {
    setpgid(0, 0);
    dup2(fd, 1);
    dup2(fd, 2);
    std::vector<char*> args;
    for (auto& a : full) args.push_back(const_cast<char*>(a.c_str()));
    args.push_back(nullptr);
    execv(args[0], args.data());
    _exit(127);
  }
  close(fd);
  if (readyText.empty()) {
    _ready = _pid > 0;
    return;
  }
  for (int i = 0; i < readySeconds * 20 && _pid > 0; ++i) {
    if (Output().find(readyText) != std::string::npos) {
      _ready = true;
      return;
    }
    usleep(50000);
  }
}

PeerProcess::~PeerProcess() {
  if (_pid > 0) {
    kill(-_pid, SIGTERM);
    kill(_pid, SIGTERM);
    int status = 0;
    for (int i = 0; i < 100; ++i) {
      if (waitpid(_pid, &status, WNOHANG) == _pid) break;
      usleep(50000);
      if (i == 99) {
        kill(-_pid, SIGKILL);
        waitpid(_pid, &status, 0);
      }
    }
  }
  if (!_log.empty()) unlink(_log.c_str());
}

std::string PeerProcess::Output() const { return _log.empty() ? std::string() : ReadFile(_log); }

std::string DeviceListFixture(std::string const& name) {
  return SourceDir() + "/tests/fixtures/" + name;
}

}  // namespace vorntest
