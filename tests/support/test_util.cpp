#include "support/test_util.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <sstream>

namespace vorntest {

TempDir::TempDir() {
  const char* base = std::getenv("TMPDIR");
  std::string tmpl = std::string(base && *base ? base : "/tmp") + "/vorntest.XXXXXX";
  std::vector<char> buf(tmpl.begin(), tmpl.end());
  buf.push_back('\0');
  if (mkdtemp(buf.data())) path_ = buf.data();
}

TempDir::~TempDir() {
  if (!path_.empty()) Run({"/bin/rm", "-rf", path_});
}

std::string ReadFile(const std::string& path) {
  std::ifstream in(path, std::ios::binary);
  if (!in) return "";
  std::ostringstream out;
  out << in.rdbuf();
  return out.str();
}

bool WriteAll(int fd, const std::string& data) {
  const char* p = data.data();
  std::size_t left = data.size();
  while (left > 0) {
    ssize_t n = write(fd, p, left);
    if (n < 0) {
      if (errno == EINTR) continue;
      if (errno == EAGAIN) {
        struct pollfd pfd = {fd, POLLOUT, 0};
        poll(&pfd, 1, 100);
        continue;
      }
      return false;
    }
    p += n;
    left -= static_cast<std::size_t>(n);
  }
  return true;
}

bool WriteFile(const std::string& path, const std::string& content, int mode) {
  int fd = open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, mode);
  if (fd < 0) return false;
  bool ok = WriteAll(fd, content);
  fchmod(fd, static_cast<mode_t>(mode));
  return close(fd) == 0 && ok;
}

bool ReplaceFile(const std::string& path, const std::string& content, int mode) {
  std::string tmp = path + ".tmp." + std::to_string(getpid());
  if (!WriteFile(tmp, content, mode) || rename(tmp.c_str(), path.c_str()) != 0) {
    unlink(tmp.c_str());
    return false;
  }
  return true;
}

bool Exists(const std::string& path) {
  struct stat st;
  return lstat(path.c_str(), &st) == 0;
}

int FileMode(const std::string& path) {
  struct stat st;
  if (stat(path.c_str(), &st) != 0) return -1;
  return static_cast<int>(st.st_mode & 07777);
}

RunResult Run(const std::vector<std::string>& argv, const std::string& input, int timeoutSec) {
  RunResult r;
  if (argv.empty()) return r;
  int inPipe[2], outPipe[2], errPipe[2];
  if (pipe2(inPipe, O_CLOEXEC) || pipe2(outPipe, O_CLOEXEC) || pipe2(errPipe, O_CLOEXEC)) return r;
  pid_t pid = fork();
  if (pid < 0) return r;
  if (pid == 0) {
    dup2(inPipe[0], 0);
    dup2(outPipe[1], 1);
    dup2(errPipe[1], 2);
    std::vector<char*> args;
    for (const auto& a : argv) args.push_back(const_cast<char*>(a.c_str()));
    args.push_back(nullptr);
    execv(args[0], args.data());
    _exit(127);
  }
  close(inPipe[0]);
  close(outPipe[1]);
  close(errPipe[1]);
  signal(SIGPIPE, SIG_IGN);
  if (!input.empty()) {
    ssize_t n = write(inPipe[1], input.data(), input.size());
    (void)n;
  }
  close(inPipe[1]);
  auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(timeoutSec);
  struct pollfd fds[2] = {{outPipe[0], POLLIN, 0}, {errPipe[0], POLLIN, 0}};
  int open = 2;
  char buf[4096];
  while (open > 0) {
    auto left = std::chrono::duration_cast<std::chrono::milliseconds>(deadline - std::chrono::steady_clock::now()).count();
    if (left <= 0) {
      kill(pid, SIGKILL);
      break;
    }
    if (poll(fds, 2, static_cast<int>(left)) < 0 && errno != EINTR) break;
    for (int i = 0; i < 2; ++i) {
      if (fds[i].fd >= 0 && (fds[i].revents & (POLLIN | POLLHUP | POLLERR))) {
        ssize_t n = read(fds[i].fd, buf, sizeof buf);
        if (n > 0) {
          (i == 0 ? r.out : r.err).append(buf, static_cast<std::size_t>(n));
        } else {
          close(fds[i].fd);
          fds[i].fd = -1;
          --open;
        }
      }
    }
  }
  for (auto& f : fds) {
    if (f.fd >= 0) close(f.fd);
  }
  int status = 0;
  while (waitpid(pid, &status, 0) < 0 && errno == EINTR) {
  }
  if (WIFEXITED(status)) r.status = WEXITSTATUS(status);
  else if (WIFSIGNALED(status)) r.status = 128 + WTERMSIG(status);
  return r;
}

ReadOnlyMount::ReadOnlyMount(const std::string& path) : path_(path) {
  ok_ = mount(path.c_str(), path.c_str(), nullptr, MS_BIND, nullptr) == 0;
  if (ok_ && mount(nullptr, path.c_str(), nullptr, MS_REMOUNT | MS_BIND | MS_RDONLY, nullptr) != 0) {
    umount(path.c_str());
    ok_ = false;
  }
}
ReadOnlyMount::~ReadOnlyMount() {
  if (ok_) umount2(path_.c_str(), MNT_DETACH);
}

SelfBindMount::SelfBindMount(const std::string& path) : path_(path) {
  ok_ = mount(path.c_str(), path.c_str(), nullptr, MS_BIND, nullptr) == 0;
}
SelfBindMount::~SelfBindMount() {
  if (ok_) umount2(path_.c_str(), MNT_DETACH);
}

RunResult Ip(std::vector<std::string> args) {
  args.insert(args.begin(), "/usr/sbin/ip");
  return Run(args);
}

void IpOk(const std::vector<std::string>& args) {
  RunResult r = Ip(args);
  if (r.status != 0) {
    std::string line = "ip";
    for (auto const& a : args) line += " " + a;
    ADD_FAILURE() << line << " failed (" << r.status << "): " << r.err;
  }
}

RunResult PeerIp(const std::string& ifname, std::vector<std::string> args) {
  std::string var = "VORN_PEER_" + ifname + "_PID";
  const char* pid = std::getenv(var.c_str());
  if (!pid) {
    RunResult r;
    r.status = -1;
    r.err = var + " is not set (sandbox without --veth " + ifname + "?)";
    return r;
  }
  args.insert(args.begin(), {"/usr/bin/nsenter", "-t", pid, "-n", "/usr/sbin/ip"});
  return Run(args);
}

bool SetPeerLink(const std::string& ifname, bool up, std::string* why) {
  RunResult r = PeerIp(ifname, {"link", "set", ifname, up ? "up" : "down"});
  if (r.status != 0) {
    if (why) *why = "ip link set on the peer failed: " + r.err;
    return false;
  }
  const std::string want = up ? "1\n" : "0\n";
  for (int i = 0; i < 100; ++i) {
    if (ReadFile("/sys/class/net/" + ifname + "/carrier") == want) return true;
    usleep(20000);
  }
  if (why) *why = "the carrier of " + ifname + " did not follow";
  return false;
}

std::string SourceDir() {
  const char* p = std::getenv("VORN_SOURCE_DIR");
  return p ? p : "";
}
std::string BinaryDir() {
  const char* p = std::getenv("VORN_BINARY_DIR");
  return p ? p : "";
}
bool InSandbox() { return std::getenv("VORN_SANDBOX") != nullptr; }

}  // namespace vorntest
