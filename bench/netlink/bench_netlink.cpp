// A burst of address events on a veth, consumed by the real vornnetd and by `ip monitor address`
// at once. Prints the CPU time each spends per event and how long each needs to have consumed
// every event. Asserts nothing. vornnetd's end is a marker: the cable of a second veth pulled after
// the burst, whose link-down action its watcher runs only after every earlier message.
//   bench_netlink --daemon PATH [--count N] [--dev IF] [--timeout S] [--rcvbuf BYTES]
//   (inside the sandbox, with --veth eth0 and its bus)
#include <linux/rtnetlink.h>
#include <signal.h>
#include <spawn.h>
#include <sys/select.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <chrono>
#include <functional>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <thread>
#include <vector>

extern char** environ;

namespace {

using Clock = std::chrono::steady_clock;

std::atomic<long> g_monitorEvents{0};
std::atomic<long long> g_monitorLastNs{0};
Clock::time_point g_origin;

long long Now() {
  return std::chrono::duration_cast<std::chrono::nanoseconds>(Clock::now() - g_origin).count();
}

pid_t Spawn(const std::vector<std::string>& args, int* outFd, int inFd = -1) {
  int pipeFd[2] = {-1, -1};
  if (outFd != nullptr && pipe(pipeFd) != 0) return -1;
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  if (outFd != nullptr) {
    posix_spawn_file_actions_adddup2(&actions, pipeFd[1], 1);
    posix_spawn_file_actions_addclose(&actions, pipeFd[0]);
  }
  if (inFd >= 0) posix_spawn_file_actions_adddup2(&actions, inFd, 0);
  std::vector<char*> argv;
  for (const auto& a : args) argv.push_back(const_cast<char*>(a.c_str()));
  argv.push_back(nullptr);
  pid_t pid = -1;
  if (posix_spawn(&pid, argv[0], &actions, nullptr, argv.data(), environ) != 0) pid = -1;
  posix_spawn_file_actions_destroy(&actions);
  if (outFd != nullptr) {
    close(pipeFd[1]);
    *outFd = pipeFd[0];
  }
  return pid;
}

// Runs `ip -batch FILE`; its exit status.
int IpBatch(const std::string& commands) {
  char path[] = "/tmp/bench-netlink-XXXXXX";
  const int fd = mkstemp(path);
  if (fd < 0) return -1;
  if (write(fd, commands.data(), commands.size()) != static_cast<ssize_t>(commands.size())) {
    close(fd);
    return -1;
  }
  close(fd);
  const pid_t pid = Spawn({"/sbin/ip", "-batch", path}, nullptr);
  int status = -1;
  if (pid > 0) waitpid(pid, &status, 0);
  unlink(path);
  return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

void ReadMonitor(int fd) {
  FILE* in = fdopen(fd, "r");
  if (in == nullptr) return;
  char line[4096];
  while (std::fgets(line, sizeof line, in) != nullptr) {
    if (line[0] == ' ' || line[0] == '\t' || line[0] == '\n') continue;  // continuation line
    if (std::strstr(line, " 10.100.") == nullptr && std::strstr(line, " 10.99.") == nullptr) {
      continue;  // not one of ours
    }
    ++g_monitorEvents;
    g_monitorLastNs = Now();
  }
  std::fclose(in);
}

// User + system CPU time of a process, in seconds (-1 when unreadable).
double ProcessCpuSeconds(pid_t pid) {
  FILE* f = std::fopen(("/proc/" + std::to_string(pid) + "/stat").c_str(), "r");
  if (f == nullptr) return -1;
  char buf[2048] = "";
  const size_t n = std::fread(buf, 1, sizeof buf - 1, f);
  std::fclose(f);
  buf[n] = '\0';
  const char* p = std::strrchr(buf, ')');
  if (p == nullptr) return -1;
  unsigned long utime = 0, stime = 0;
  // Fields after the name: state(3) ... utime(14) stime(15).
  if (std::sscanf(p + 2, "%*c %*d %*d %*d %*d %*d %*u %*u %*u %*u %*u %lu %lu", &utime, &stime) != 2) {
    return -1;
  }
  return static_cast<double>(utime + stime) / sysconf(_SC_CLK_TCK);
}

bool WaitUntil(const std::function<bool()>& done, double seconds) {
  const auto end = Clock::now() + std::chrono::duration<double>(seconds);
  while (Clock::now() < end) {
    if (done()) return true;
    std::this_thread::sleep_for(std::chrono::milliseconds(2));
  }
  return done();
}

std::string Commands(const char* verb, int count, const std::string& dev) {
  std::string text;
  for (int i = 0; i < count; ++i) {
    text += std::string("address ") + verb + " 10.100." + std::to_string(i / 250) + "." +
            std::to_string(i % 250 + 1) + "/32 dev " + dev + "\n";
  }
  return text;
}

// The real vornnetd consuming the same burst. Its watcher reads one socket in order, so when the
// platform's link-down action runs for a marker interface whose cable is pulled after the burst,
// every address event before it has been handled. Only that action is installed: no hook.
const char kMarkFile[] = "/tmp/bench-netlink-mark";
const char kLinkDownAction[] = "/usr/vorn/libexec/platform/VLIBNetIfLinkDownEvent";

bool Sh(const std::string& command) {
  const pid_t pid = Spawn({"/bin/sh", "-c", command}, nullptr);
  int status = -1;
  if (pid > 0) waitpid(pid, &status, 0);
  return WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

// Pulls the marker's cable and waits for the action; seconds from the pull, -1 on time-out.
double Mark(double timeout) {
  unlink(kMarkFile);
  const auto t0 = Clock::now();
  if (!Sh("ip link set mark1 down")) return -1;
  const bool seen = WaitUntil([] { return access(kMarkFile, F_OK) == 0; }, timeout);
  const double s = std::chrono::duration<double>(Clock::now() - t0).count();
  Sh("ip link set mark1 up");
  // Wait for the carrier to come back, so the next pull is a change.
  WaitUntil([] { return Sh("grep -qx 1 /sys/class/net/mark0/carrier"); }, 5);
  return seen ? s : -1;
}

int SyslogCount(const char* text) {
  const char* path = std::getenv("VORN_SYSLOG_FILE");
  if (path == nullptr) return -1;
  FILE* f = std::fopen(path, "r");
  if (f == nullptr) return -1;
  char line[4096];
  int n = 0;
  while (std::fgets(line, sizeof line, f) != nullptr) n += std::strstr(line, text) != nullptr;
  std::fclose(f);
  return n;
}

int RunDaemon(const std::string& daemon, int count, const std::string& dev, double timeout) {
  if (!Sh("mkdir -p /usr/vorn/libexec/platform && printf '#!/bin/sh\\n[ \"$1\" = mark0 ] && : > " +
          std::string(kMarkFile) + "\\nexit 0\\n' > " + kLinkDownAction + " && chmod 755 " +
          kLinkDownAction) ||
      !Sh("ip link add mark0 type veth peer name mark1 && ip link set mark0 up && "
          "ip link set mark1 up")) {
    std::fprintf(stderr, "cannot set up the marker\n");
    return 1;
  }
  WaitUntil([] { return Sh("grep -qx 1 /sys/class/net/mark0/carrier"); }, 5);
  const pid_t pid = Spawn({daemon}, nullptr);
  if (pid <= 0) return 1;
  // Until the watcher runs: the first pull that is reported.
  double idle = -1;
  for (int i = 0; i < 20 && idle < 0; ++i) idle = Mark(0.5);
  if (idle < 0) {
    std::fprintf(stderr, "vornnetd did not report the marker\n");
    kill(pid, SIGTERM);
    waitpid(pid, nullptr, 0);
    return 1;
  }
  idle = Mark(5);  // the latency of the marker alone, on an idle daemon
  const int lostBase = SyslogCount("recvmsg ret");
  const double cpuBase = ProcessCpuSeconds(pid);

  int monitorFd = -1;
  const pid_t monitor = Spawn({"/sbin/ip", "monitor", "address"}, &monitorFd);
  std::thread reader(ReadMonitor, monitorFd);
  WaitUntil([] { return false; }, 0.3);  // let ip monitor subscribe
  const long monitorBase = g_monitorEvents;
  const double monitorCpuBase = ProcessCpuSeconds(monitor);
  const int resyncBase = SyslogCount("Netlink events lost");
  const long expected = 2L * count;
  const long long start = Now();
  const int rcAdd = IpBatch(Commands("add", count, dev));
  const int rcDel = IpBatch(Commands("del", count, dev));
  const long long produced = Now();
  WaitUntil([&] { return g_monitorEvents - monitorBase >= expected; }, timeout);
  const double marked = Mark(timeout);
  const long long consumed = Now();
  const double cpu = ProcessCpuSeconds(pid) - cpuBase;
  const double monitorCpu = ProcessCpuSeconds(monitor) - monitorCpuBase;
  const long monitorGot = g_monitorEvents - monitorBase;
  kill(monitor, SIGTERM);
  waitpid(monitor, nullptr, 0);
  reader.join();
  kill(pid, SIGTERM);
  waitpid(pid, nullptr, 0);

  auto seconds = [&](long long ns) { return (ns - start) / 1e9; };
  std::printf("vornnetd (%s): %d additions + %d removals on %s (ip -batch exit %d/%d), no hook\n",
              daemon.c_str(), count, count, dev.c_str(), rcAdd, rcDel);
  std::printf("%-28s %10.3f s\n", "producer (ip -batch)", seconds(produced));
  std::printf("%-28s %10.3f s  (%ld of %ld events)\n", "ip monitor address",
              seconds(g_monitorLastNs), g_monitorEvents - monitorBase, expected);
  if (marked < 0) {
    std::printf("vornnetd: the marker after the burst was not reported within %.0f s\n", timeout);
  } else {
    std::printf("%-28s %10.3f s  (the marker's own latency on an idle daemon: %.1f ms)\n",
                "vornnetd, all consumed", seconds(consumed) - idle, idle * 1000);
  }
  std::printf("vornnetd recv errors: %d, losses that made it read the state again: %d\n",
              SyslogCount("recvmsg ret") - lostBase, SyslogCount("Netlink events lost") - resyncBase);
  std::printf("%-28s %10s %14s\n", "CPU", "seconds", "us/event");
  std::printf("%-28s %10.3f %14.1f\n", "vornnetd", cpu, cpu * 1e6 / expected);
  std::printf("%-28s %10.3f %14.1f  (%ld events seen)\n", "ip monitor address", monitorCpu,
              monitorGot > 0 ? monitorCpu * 1e6 / monitorGot : 0.0, monitorGot);
  if (monitorCpu > 0) std::printf("vornnetd / ip monitor CPU ratio: %.2f\n", cpu / monitorCpu);
  return 0;
}

}  // namespace

int main(int argc, char** argv) {
  int count = 10000;
  double timeout = 120;
  std::string dev = "eth0", daemon;
  for (int i = 1; i + 1 < argc; i += 2) {
    if (std::strcmp(argv[i], "--daemon") == 0) daemon = argv[i + 1];
    if (std::strcmp(argv[i], "--count") == 0) count = std::atoi(argv[i + 1]);
    if (std::strcmp(argv[i], "--dev") == 0) dev = argv[i + 1];
    if (std::strcmp(argv[i], "--timeout") == 0) timeout = std::atof(argv[i + 1]);
    if (std::strcmp(argv[i], "--rcvbuf") == 0) setenv("VORN_NETLINK_RCVBUF", argv[i + 1], 1);
  }
  if (count < 1 || count > 60000) {
    std::fprintf(stderr, "--count must be 1..60000\n");
    return 2;
  }
  if (daemon.empty()) {
    std::fprintf(stderr, "usage: bench_netlink --daemon PATH [--count N] [--dev IF] [--timeout S] "
                         "[--rcvbuf BYTES]\n");
    return 2;
  }
  g_origin = Clock::now();
  return RunDaemon(daemon, count, dev, timeout);
}
