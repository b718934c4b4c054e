#include "support/daemon_process.h"

#include <signal.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <thread>

#include "support/test_util.h"

extern char** environ;

namespace vorntest {

namespace {

int StatusOf(int raw) {
  if (WIFEXITED(raw)) return WEXITSTATUS(raw);
  if (WIFSIGNALED(raw)) return 128 + WTERMSIG(raw);
  return -1;
}

}  // namespace

bool NameHasOwner(const std::string& name) {
  RunResult r =
      Run({"/usr/bin/gdbus", "call", "--session", "--dest", "org.freedesktop.DBus", "--object-path",
           "/org/freedesktop/DBus", "--method", "org.freedesktop.DBus.NameHasOwner", name});
  return r.status == 0 && r.out == "(true,)\n";
}

pid_t NameOwnerPid(const std::string& name) {
  RunResult r = Run({"/usr/bin/gdbus", "call", "--session", "--dest", "org.freedesktop.DBus",
                     "--object-path", "/org/freedesktop/DBus", "--method",
                     "org.freedesktop.DBus.GetConnectionUnixProcessID", name});
  const std::string prefix = "(uint32 ";
  if (r.status != 0 || r.out.compare(0, prefix.size(), prefix) != 0) return -1;
  return static_cast<pid_t>(std::stol(r.out.substr(prefix.size())));
}

DaemonProcess::DaemonProcess(const std::vector<std::string>& argv, const std::string& name) {
  std::vector<char*> cargv;
  for (auto& a : argv) cargv.push_back(const_cast<char*>(a.c_str()));
  cargv.push_back(nullptr);
  if (posix_spawn(&pid_, cargv[0], nullptr, nullptr, cargv.data(), environ) != 0) {
    pid_ = -1;
    return;
  }
  if (name.empty()) return;
  auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(10);
  while (std::chrono::steady_clock::now() < deadline) {
    if (NameOwnerPid(name) == pid_) {
      ready_ = true;
      return;
    }
    if (Wait(0) >= 0) return;  // ended before owning the name
    std::this_thread::sleep_for(std::chrono::milliseconds(20));
  }
}

DaemonProcess::~DaemonProcess() { Stop(SIGTERM); }

bool DaemonProcess::running() { return pid_ > 0 && Wait(0) < 0 && pid_ > 0; }

int DaemonProcess::Wait(int timeoutSec) {
  if (pid_ < 0) return status_;
  auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(timeoutSec);
  for (;;) {
    int raw = 0;
    pid_t r = waitpid(pid_, &raw, WNOHANG);
    if (r == pid_) {
      status_ = StatusOf(raw);
      pid_ = -1;
      return status_;
    }
    if (r < 0 && errno != EINTR) return -1;
    if (std::chrono::steady_clock::now() >= deadline) return -1;
    std::this_thread::sleep_for(std::chrono::milliseconds(10));
  }
}

int DaemonProcess::Stop(int sig) {
  if (pid_ < 0) return status_;
  kill(pid_, sig);
  int status = Wait(20);
  if (status < 0 && pid_ > 0) {
    kill(pid_, SIGKILL);
    Wait(5);
    return -1;
  }
  return status;
}

}  // namespace vorntest
