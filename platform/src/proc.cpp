// Processes: exec without a shell, pipes, forks, pid files, liveness and signals.
#include "vornplatform/proc.h"

#include <dirent.h>
#include <fcntl.h>
#include <pthread.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstdarg>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <map>
#include <string>
#include <vector>

#include "internal.h"
#include "vornplatform/child_limit.h"
#include "vornplatform/err.h"
#include "vornplatform/log.h"

using vornplatform::internal::AtomicWriteFile;
using vornplatform::internal::HasText;
using vornplatform::internal::NoThrow;
using vornplatform::internal::ReadWholeFile;
using vornplatform::internal::ChildWait;
using vornplatform::internal::KillChildGroup;
using vornplatform::internal::MonotonicMs;
using vornplatform::internal::SpawnResult;
using vornplatform::internal::WaitChildBounded;

namespace {

constexpr int kMaxArgs = 4096;

// Held from making a child's pipes until the parent has closed the child's ends, and around
// every fork that does not exec. Otherwise a child forked by another thread at that moment would
// keep those ends open, and the parent would wait for an end of file that does not come.
// A plain pthread mutex: a forking thread unlocks its copy in the child as well.
pthread_mutex_t gForkMutex = PTHREAD_MUTEX_INITIALIZER;

struct ForkGuard {
  ForkGuard() { pthread_mutex_lock(&gForkMutex); }
  ~ForkGuard() { Release(); }
  void Release() {
    if (held) {
      held = false;
      pthread_mutex_unlock(&gForkMutex);
    }
  }
  bool held = true;
  ForkGuard(const ForkGuard&) = delete;
  ForkGuard& operator=(const ForkGuard&) = delete;
};

// fork() for children that go on without exec.
pid_t ForkUnderGuard() {
  ForkGuard guard;
  return fork();  // the child releases its copy through the guard too
}

void CloseFd(int& fd) {
  if (fd >= 0) {
    close(fd);
    fd = -1;
  }
}

// In a child between fork and exec (async-signal-safe calls only): signals a parent ignores or
// blocks must not leak into the program it runs.
void ResetSignalsInChild() {
  struct sigaction dfl;
  std::memset(&dfl, 0, sizeof dfl);
  dfl.sa_handler = SIG_DFL;
  for (int sig = 1; sig < NSIG; ++sig) {
    if (sig == SIGKILL || sig == SIGSTOP) continue;
    sigaction(sig, &dfl, nullptr);
  }
  sigset_t none;
  sigemptyset(&none);
  sigprocmask(SIG_SETMASK, &none, nullptr);
}

// Makes fd the descriptor target in a child (clearing close-on-exec on it).
void MoveFdInChild(int fd, int target) {
  if (fd == target) {
    fcntl(fd, F_SETFD, 0);
  } else {
    dup2(fd, target);
  }
}

// After exec failed in a child: tells the parent why, then leaves.
[[noreturn]] void ReportExecFailure(int errFd) {
  const int e = errno;
  ssize_t n;
  do {
    n = write(errFd, &e, sizeof e);
  } while (n < 0 && errno == EINTR);
  _exit(127);
}

// Reads the exec report of a child: 0 when the exec succeeded, else the child's errno.
int ReadExecReport(int errFd) {
  int childErr = 0;
  ssize_t n;
  do {
    n = read(errFd, &childErr, sizeof childErr);
  } while (n < 0 && errno == EINTR);
  return n == static_cast<ssize_t>(sizeof childErr) ? (childErr != 0 ? childErr : EIO) : 0;
}

// waitpid with EINTR retry. The status, or -1 with errno.
int WaitChild(pid_t pid, int* status) {
  for (;;) {
    if (waitpid(pid, status, 0) == pid) return 0;
    if (errno != EINTR) return -1;
  }
}

int ResultOf(const SpawnResult& r) {
  if (r.status >= 0) return r.status;
  if (r.error == ENOENT || r.error == ENOTDIR) {
    errno = r.error;
    VLIBC_ERR_SET(VLIBC_ERR_NOT_FOUND);
  } else {
    errno = r.error;
    VLIBC_ERR_SET(VLIBC_ERR_EXEC);
  }
  return -1;
}

int RunArgs(const char* path, std::vector<const char*>& args) {
  args.push_back(nullptr);
  const SpawnResult r =
      vornplatform::internal::Spawn(path, const_cast<char* const*>(args.data()), nullptr, false,
                                    vornplatform::ChildLimitMs(vornplatform::kExecLimitMs));
  return ResultOf(r);
}

// A child of VLIBCPopen, from its start until VLIBCPclose reaps it.
struct PopenChild {
  pid_t pid = -1;
  pid_t owner = -1;      // the process that started it (a forked copy of us must not kill it)
  int64_t deadline = 0;  // MonotonicMs()
  long limitMs = 0;
  std::string path;
  bool killed = false;  // the watchdog killed its group at the deadline
};

// Open streams of VLIBCPopen and their children; guarded by gForkMutex, so that a child forked
// meanwhile never inherits it locked.
std::map<FILE*, PopenChild>* gPopenChildren = nullptr;
// Wakes the watchdog when a stream is opened (waits with gForkMutex).
pthread_cond_t gPopenCond;
// The process whose watchdog thread runs (a forked copy of us has none and starts its own).
pid_t gWatchdogOwner = -1;

// Kills the group of every stream whose child outlives its deadline while the caller still reads
// or writes it: the caller's next read sees the end of the stream, and VLIBCPclose fails.
void* PopenWatchdog(void*) {
  pthread_mutex_lock(&gForkMutex);
  for (;;) {
    int64_t next = -1;
    const int64_t now = MonotonicMs();
    const pid_t self = getpid();
    for (auto& kv : *gPopenChildren) {
      PopenChild& c = kv.second;
      if (c.killed || c.owner != self) continue;
      if (c.deadline <= now) {
        KillChildGroup(c.pid, c.path.c_str(), c.limitMs);
        c.killed = true;
      } else if (next < 0 || c.deadline < next) {
        next = c.deadline;
      }
    }
    if (next < 0) {
      pthread_cond_wait(&gPopenCond, &gForkMutex);
    } else {
      struct timespec ts;
      ts.tv_sec = static_cast<time_t>(next / 1000);
      ts.tv_nsec = static_cast<long>(next % 1000) * 1000000L;
      pthread_cond_timedwait(&gPopenCond, &gForkMutex, &ts);
    }
  }
}

// With gForkMutex held: the watchdog of this process runs (started on first use). False when it
// cannot be started; the stream then has no watchdog and VLIBCPclose still bounds its wait.
bool EnsurePopenWatchdog() {
  if (gWatchdogOwner == getpid()) return true;
  static bool condReady = false;
  if (!condReady) {
    pthread_condattr_t attr;
    pthread_condattr_init(&attr);
    pthread_condattr_setclock(&attr, CLOCK_MONOTONIC);
    pthread_cond_init(&gPopenCond, &attr);
    pthread_condattr_destroy(&attr);
    condReady = true;
  }
  pthread_attr_t attr;
  pthread_attr_init(&attr);
  pthread_attr_setdetachstate(&attr, PTHREAD_CREATE_DETACHED);
  pthread_attr_setstacksize(&attr, 64 * 1024);
  // The watchdog must not take signals meant for the daemon's own threads.
  sigset_t all, old;
  sigfillset(&all);
  pthread_sigmask(SIG_SETMASK, &all, &old);
  pthread_t thread;
  const int rc = pthread_create(&thread, &attr, PopenWatchdog, nullptr);
  pthread_sigmask(SIG_SETMASK, &old, nullptr);
  pthread_attr_destroy(&attr);
  if (rc != 0) return false;
  gWatchdogOwner = getpid();
  return true;
}

bool ReadSmallFile(const std::string& path, std::string& out) {
  return ReadWholeFile(path.c_str(), out, 1u << 20) == 0;
}

// Calls fn(pid) for every process in /proc. false when /proc cannot be read.
template <typename F>
bool ForEachProcess(F&& fn) {
  DIR* d = opendir("/proc");
  if (d == nullptr) return false;
  try {
    while (const struct dirent* de = readdir(d)) {
      char* end = nullptr;
      const long pid = std::strtol(de->d_name, &end, 10);
      if (end == de->d_name || *end != '\0' || pid <= 0) continue;
      fn(static_cast<pid_t>(pid));
    }
  } catch (...) {
    closedir(d);
    throw;
  }
  closedir(d);
  return true;
}

}  // namespace

namespace vornplatform {
namespace internal {

SpawnResult Spawn(const char* path, char* const argv[], std::string* out, bool nullStdin,
                  long limitMs) {
  SpawnResult r;
  int errPipe[2] = {-1, -1};
  int outPipe[2] = {-1, -1};
  int devNull = -1;
  ForkGuard guard;
  auto cleanup = [&]() {
    const int e = errno;
    CloseFd(errPipe[0]);
    CloseFd(errPipe[1]);
    CloseFd(outPipe[0]);
    CloseFd(outPipe[1]);
    CloseFd(devNull);
    errno = e;
  };
  if (pipe2(errPipe, O_CLOEXEC) != 0 || (out != nullptr && pipe2(outPipe, O_CLOEXEC) != 0)) {
    r.error = errno;
    cleanup();
    return r;
  }
  if (nullStdin) devNull = open("/dev/null", O_RDONLY | O_CLOEXEC);
  const int64_t deadline = MonotonicMs() + limitMs;
  const pid_t pid = fork();
  if (pid < 0) {
    r.error = errno;
    cleanup();
    return r;
  }
  if (pid == 0) {
    setpgid(0, 0);
    ResetSignalsInChild();
    if (outPipe[1] >= 0) MoveFdInChild(outPipe[1], STDOUT_FILENO);
    if (devNull >= 0) MoveFdInChild(devNull, STDIN_FILENO);
    execv(path, argv);
    ReportExecFailure(errPipe[1]);
  }
  setpgid(pid, pid);  // either side may come first; the group exists before we could kill it
  CloseFd(errPipe[1]);
  CloseFd(outPipe[1]);
  CloseFd(devNull);
  guard.Release();
  const int execErr = ReadExecReport(errPipe[0]);
  CloseFd(errPipe[0]);
  int status = 0;
  const int readFd = execErr == 0 ? outPipe[0] : -1;
  if (readFd < 0) CloseFd(outPipe[0]);
  outPipe[0] = -1;  // WaitChildBounded closes it
  const ChildWait w = WaitChildBounded(pid, path, limitMs, deadline, &status, readFd, out);
  if (w == ChildWait::kError) {
    r.error = errno;
    return r;
  }
  if (w == ChildWait::kTimedOut) {
    r.timedOut = true;
    r.signal = SIGKILL;
    r.error = ETIMEDOUT;
    return r;
  }
  if (execErr != 0) {
    r.error = execErr;
  } else if (WIFEXITED(status)) {
    r.status = WEXITSTATUS(status);
  } else if (WIFSIGNALED(status)) {
    r.signal = WTERMSIG(status);
    r.error = EINTR;
  }
  return r;
}

}  // namespace internal
}  // namespace vornplatform

int VLIBCExec(const char* path, const char* a1, const char* a2, const char* a3, const char* a4) {
  if (!HasText(path)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return NoThrow(-1, [&]() -> int {
    std::vector<const char*> args{path};
    for (const char* a : {a1, a2, a3, a4}) {
      if (a == nullptr) break;
      args.push_back(a);
    }
    return RunArgs(path, args);
  });
}

// argv of a variadic call: path, then the NULL-ended arguments of ap. 0, or -1 (error set).
int CollectArgs(const char* path, va_list ap, std::vector<const char*>* out) {
  return NoThrow(-1, [&]() -> int {
    std::vector<const char*>& args = *out;
    args.push_back(path);
    for (;;) {
      const char* a = va_arg(ap, const char*);
      if (a == nullptr) break;
      if (static_cast<int>(args.size()) >= kMaxArgs) {
        VLIBC_ERR_SET(VLIBC_ERR_TOO_LONG);
        return -1;
      }
      args.push_back(a);
    }
    return 0;
  });
}

int VLIBCExecl(const char* path, int flags, ...) {
  if (!HasText(path)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  std::vector<const char*> args;
  va_list ap;
  va_start(ap, flags);
  const int rc = CollectArgs(path, ap, &args);
  va_end(ap);
  if (rc != 0) return -1;
  return NoThrow(-1, [&]() -> int { return RunArgs(path, args); });
}

int VLIBCExecv(const char* path, char* const argv[], int /*flags*/) {
  if (!HasText(path)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return NoThrow(-1, [&]() -> int {
    std::vector<const char*> args;
    if (argv == nullptr || argv[0] == nullptr) {
      args.push_back(path);
    } else {
      for (int i = 0; argv[i] != nullptr; ++i) args.push_back(argv[i]);
    }
    return RunArgs(path, args);
  });
}

namespace vornnetsdk {
namespace sdk_s {
int VLIBCExec_S(const char* path, const char* a1, const char* a2, const char* a3, const char* a4) {
  return VLIBCExec(path, a1, a2, a3, a4);
}
}  // namespace sdk_s
}  // namespace vornnetsdk

FILE* VLIBCPopen(const char* path, const char* mode, ...) {
  if (!HasText(path) || mode == nullptr || (mode[0] != 'r' && mode[0] != 'w')) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return nullptr;
  }
  const bool reading = mode[0] == 'r';
  std::vector<const char*> args;
  va_list ap;
  va_start(ap, mode);
  int rc = CollectArgs(path, ap, &args);
  if (rc == 0) rc = NoThrow(-1, [&]() -> int {
    args.push_back(nullptr);
    return 0;
  });
  va_end(ap);
  if (rc != 0) return nullptr;
  return NoThrow<FILE*>(nullptr, [&]() -> FILE* {
    const long limitMs = vornplatform::ChildLimitMs(vornplatform::kPopenLimitMs);
    ForkGuard guard;
    int io[2] = {-1, -1};
    int errPipe[2] = {-1, -1};
    if (pipe2(io, O_CLOEXEC) != 0 || pipe2(errPipe, O_CLOEXEC) != 0) {
      VLIBC_ERR_SET(VLIBC_ERR_IO);
      CloseFd(io[0]);
      CloseFd(io[1]);
      return nullptr;
    }
    int& mine = reading ? io[0] : io[1];
    int& theirs = reading ? io[1] : io[0];
    const int64_t deadline = MonotonicMs() + limitMs;
    const pid_t pid = fork();
    if (pid < 0) {
      VLIBC_ERR_SET(VLIBC_ERR_EXEC);
      CloseFd(io[0]);
      CloseFd(io[1]);
      CloseFd(errPipe[0]);
      CloseFd(errPipe[1]);
      return nullptr;
    }
    if (pid == 0) {
      setpgid(0, 0);
      ResetSignalsInChild();
      MoveFdInChild(theirs, reading ? STDOUT_FILENO : STDIN_FILENO);
      execv(path, const_cast<char* const*>(args.data()));
      ReportExecFailure(errPipe[1]);
    }
    setpgid(pid, pid);
    CloseFd(theirs);
    CloseFd(errPipe[1]);
    guard.Release();
    const int execErr = ReadExecReport(errPipe[0]);
    CloseFd(errPipe[0]);
    int status = 0;
    if (execErr != 0) {
      CloseFd(mine);
      WaitChild(pid, &status);
      errno = execErr;
      VLIBC_ERR_SET(execErr == ENOENT ? VLIBC_ERR_NOT_FOUND : VLIBC_ERR_EXEC);
      return nullptr;
    }
    FILE* fp = fdopen(mine, reading ? "r" : "w");
    if (fp != nullptr) {
      try {
        PopenChild child;
        child.pid = pid;
        child.owner = getpid();
        child.limitMs = limitMs;
        child.deadline = deadline;
        child.path = path;
        ForkGuard lock;
        if (gPopenChildren == nullptr) gPopenChildren = new std::map<FILE*, PopenChild>();
        (*gPopenChildren)[fp] = std::move(child);
        if (EnsurePopenWatchdog()) pthread_cond_signal(&gPopenCond);
        return fp;
      } catch (...) {
        std::fclose(fp);
        mine = -1;
      }
    }
    CloseFd(mine);
    kill(-pid, SIGKILL);
    WaitChild(pid, &status);
    VLIBC_ERR_SET(VLIBC_ERR_NO_MEMORY);
    return nullptr;
  });
}

int VLIBCPclose(FILE* fp) {
  if (fp == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  PopenChild child;
  bool found = false;
  NoThrow(0, [&]() -> int {
    ForkGuard lock;
    if (gPopenChildren != nullptr) {
      auto it = gPopenChildren->find(fp);
      if (it != gPopenChildren->end()) {
        child = std::move(it->second);
        gPopenChildren->erase(it);
        found = true;
      }
    }
    return 0;
  });
  if (!found) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);  // not a stream of VLIBCPopen
    return -1;
  }
  std::fclose(fp);
  int status = 0;
  // A child the watchdog has killed (and logged) is reaped at once.
  const ChildWait w =
      child.killed ? (WaitChild(child.pid, &status) == 0 ? ChildWait::kExited : ChildWait::kError)
                   : WaitChildBounded(child.pid, child.path.c_str(), child.limitMs,
                                      child.deadline, &status, -1, nullptr);
  if (w != ChildWait::kExited || child.killed) {
    if (w == ChildWait::kTimedOut || child.killed) errno = ETIMEDOUT;
    VLIBC_ERR_SET(VLIBC_ERR_EXEC);
    return -1;
  }
  if (WIFEXITED(status)) return WEXITSTATUS(status);
  VLIBC_ERR_SET(VLIBC_ERR_EXEC);
  return -1;
}

pid_t VLIBCProcForkEx(int flags) {
  if ((flags & VLIBC_FORK_DETACH) == 0) {
    const pid_t pid = ForkUnderGuard();
    if (pid < 0) VLIBC_ERR_SET(VLIBC_ERR_EXEC);
    return pid;
  }
  // Detached: the child forks the real worker and leaves at once, so the worker is adopted by
  // init (or the nearest subreaper) and never becomes our zombie. Its pid comes back on a pipe.
  int pidPipe[2];
  if (pipe2(pidPipe, O_CLOEXEC) != 0) {
    VLIBC_ERR_SET(VLIBC_ERR_EXEC);
    return -1;
  }
  const pid_t middle = ForkUnderGuard();
  if (middle < 0) {
    VLIBC_ERR_SET(VLIBC_ERR_EXEC);
    close(pidPipe[0]);
    close(pidPipe[1]);
    return -1;
  }
  if (middle == 0) {
    close(pidPipe[0]);
    setsid();
    const pid_t worker = fork();
    if (worker == 0) {
      close(pidPipe[1]);
      return 0;
    }
    ssize_t n;
    do {
      n = write(pidPipe[1], &worker, sizeof worker);
    } while (n < 0 && errno == EINTR);
    _exit(worker < 0 ? 1 : 0);
  }
  close(pidPipe[1]);
  pid_t worker = -1;
  ssize_t n;
  do {
    n = read(pidPipe[0], &worker, sizeof worker);
  } while (n < 0 && errno == EINTR);
  close(pidPipe[0]);
  int status = 0;
  WaitChild(middle, &status);
  if (n != static_cast<ssize_t>(sizeof worker) || worker <= 0) {
    VLIBC_ERR_SET(VLIBC_ERR_EXEC);
    return -1;
  }
  return worker;
}

pid_t VLIBCProcForkChildNoWait() {
  const pid_t pid = ForkUnderGuard();
  if (pid < 0) VLIBC_ERR_SET(VLIBC_ERR_EXEC);
  return pid;
}

int VLIBCProcPidFileCreate(const char* path) {
  if (!HasText(path)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return NoThrow(-1, [&]() -> int {
    if (AtomicWriteFile(path, std::to_string(getpid()) + "\n") != 0) {
      VLIBC_ERR_SET(errno == ENOENT || errno == ENOTDIR ? VLIBC_ERR_NOT_FOUND : VLIBC_ERR_IO);
      return -1;
    }
    return 0;
  });
}

pid_t VLIBCReadPidFile(const char* path) {
  if (!HasText(path)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return NoThrow<pid_t>(0, [&]() -> pid_t {
    std::string text;
    if (ReadWholeFile(path, text, 4096) != 0) {
      VLIBC_ERR_SET(errno == ENOENT || errno == ENOTDIR ? VLIBC_ERR_NOT_FOUND : VLIBC_ERR_IO);
      return 0;
    }
    const char* p = text.c_str();
    while (*p == ' ' || *p == '\t' || *p == '\n' || *p == '\r') ++p;
    if (*p < '0' || *p > '9') {
      VLIBC_ERR_SET(VLIBC_ERR_FORMAT);
      return 0;
    }
    errno = 0;
    char* end = nullptr;
    const long pid = std::strtol(p, &end, 10);
    if (errno != 0 || pid <= 0 || pid > INT_MAX ||
        (*end != '\0' && *end != '\n' && *end != '\r' && *end != ' ' && *end != '\t')) {
      VLIBC_ERR_SET(VLIBC_ERR_FORMAT);
      return 0;
    }
    return static_cast<pid_t>(pid);
  });
}

int VLIBCProcAlive(pid_t pid) {
  if (pid <= 0) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return 0;
  }
  if (kill(pid, 0) != 0 && errno != EPERM) {
    VLIBC_ERR_SET(VLIBC_ERR_NOT_FOUND);
    return 0;
  }
  // A zombie (or a process being torn down) still answers kill() but is dead.
  return NoThrow(1, [&]() -> int {
    std::string stat;
    if (ReadWholeFile(("/proc/" + std::to_string(pid) + "/stat").c_str(), stat, 1u << 16) != 0) {
      if (errno == ENOENT) {
        VLIBC_ERR_SET(VLIBC_ERR_NOT_FOUND);
        return 0;  // gone in between
      }
      return 1;  // no /proc: kill() has the last word
    }
    const std::size_t paren = stat.rfind(')');
    if (paren != std::string::npos && paren + 2 < stat.size()) {
      const char state = stat[paren + 2];
      if (state == 'Z' || state == 'X' || state == 'x') {
        VLIBC_ERR_SET(VLIBC_ERR_NOT_FOUND);
        return 0;
      }
    }
    return 1;
  });
}

int VLIBCProcAliveByPidFile(const char* path) {
  const pid_t pid = VLIBCReadPidFile(path);
  return pid > 0 ? VLIBCProcAlive(pid) : 0;
}

int VLIBCProcSignalByPidFile(const char* path, int sig, int /*flags*/, int /*reserved*/) {
  if (!HasText(path) || sig < 0 || sig >= NSIG) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  const pid_t pid = VLIBCReadPidFile(path);
  if (pid <= 0) return -1;  // error recorded by VLIBCReadPidFile
  if (kill(pid, sig) != 0) {
    VLIBC_ERR_SET(errno == ESRCH ? VLIBC_ERR_NOT_FOUND : VLIBC_ERR_IO);
    return -1;
  }
  return 0;
}

int VLIBCPs(const char* pattern, int /*flags*/, int /*reserved*/) {
  if (!HasText(pattern)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return NoThrow(-1, [&]() -> int {
    const pid_t self = getpid();
    int count = 0;
    const bool ok = ForEachProcess([&](pid_t pid) {
      if (pid == self) return;
      std::string cmd;
      if (!ReadSmallFile("/proc/" + std::to_string(pid) + "/cmdline", cmd)) return;
      while (!cmd.empty() && cmd.back() == '\0') cmd.pop_back();
      for (char& c : cmd) {
        if (c == '\0') c = ' ';
      }
      if (cmd.find(pattern) != std::string::npos) ++count;
    });
    if (!ok) {
      VLIBC_ERR_SET(VLIBC_ERR_IO);
      return -1;
    }
    return count;
  });
}

int VLIBCKill(const char* name) {
  if (!HasText(name)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return NoThrow(-1, [&]() -> int {
    // The kernel keeps at most 15 characters of a command name.
    const std::string wanted = std::string(name).substr(0, 15);
    const pid_t self = getpid();
    bool failed = false;
    const bool ok = ForEachProcess([&](pid_t pid) {
      if (pid == self) return;
      std::string comm;
      if (!ReadSmallFile("/proc/" + std::to_string(pid) + "/comm", comm)) return;
      while (!comm.empty() && (comm.back() == '\n' || comm.back() == '\0')) comm.pop_back();
      if (comm != wanted) return;
      if (kill(pid, SIGTERM) != 0 && errno != ESRCH) {
        failed = true;
        VLIBC_ERR_SET(VLIBC_ERR_IO);
      }
    });
    if (!ok) {
      VLIBC_ERR_SET(VLIBC_ERR_IO);
      return -1;
    }
    return failed ? -1 : 0;
  });
}
