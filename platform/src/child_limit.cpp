// Time limits of child processes: the scoped override and the bounded wait for one child.
#include "vornplatform/child_limit.h"

#include <poll.h>
#include <signal.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <time.h>
#include <unistd.h>

#include <cerrno>
#include <string>

#include "internal.h"
#include "vornplatform/log.h"

namespace {

thread_local long tScopedLimitMs = 0;

// How often a child is looked at when the kernel offers no pidfd.
constexpr int kPollStepMs = 20;

int OpenPidFd(pid_t pid) {
#ifdef SYS_pidfd_open
  const long fd = syscall(SYS_pidfd_open, pid, 0);
  return fd < 0 ? -1 : static_cast<int>(fd);
#else
  (void)pid;
  return -1;
#endif
}

}  // namespace

namespace vornplatform {

ScopedChildLimit::ScopedChildLimit(long limitMs) : _saved(tScopedLimitMs) {
  if (limitMs > 0) tScopedLimitMs = limitMs;
}

ScopedChildLimit::~ScopedChildLimit() { tScopedLimitMs = _saved; }

long ChildLimitMs(long defaultMs) { return tScopedLimitMs > 0 ? tScopedLimitMs : defaultMs; }

namespace internal {

int64_t MonotonicMs() {
  struct timespec ts;
  clock_gettime(CLOCK_MONOTONIC, &ts);
  return static_cast<int64_t>(ts.tv_sec) * 1000 + ts.tv_nsec / 1000000;
}

void KillChildGroup(pid_t pid, const char* path, long limitMs) {
  // The group id is the leader's pid, which cannot be reused before the leader is reaped.
  if (kill(-pid, SIGKILL) != 0) kill(pid, SIGKILL);
  VORN_LOG(LOG_ERR, "%s still running after its limit of %ld ms: killed with its process group",
           path, limitMs);
}

ChildWait WaitChildBounded(pid_t pid, const char* path, long limitMs, int64_t deadlineMs,
                           int* status, int outFd, std::string* out) {
  const int pidFd = OpenPidFd(pid);
  bool exited = false;
  ChildWait result = ChildWait::kExited;
  for (;;) {
    if (!exited) {
      const pid_t r = waitpid(pid, status, WNOHANG);
      if (r == pid) {
        exited = true;
      } else if (r < 0 && errno != EINTR) {
        result = ChildWait::kError;
        break;
      }
    }
    if (exited && outFd < 0) break;
    const int64_t now = MonotonicMs();
    if (now >= deadlineMs) {
      if (!exited) {
        KillChildGroup(pid, path, limitMs);
        int e;
        do {
          e = waitpid(pid, status, 0);
        } while (e < 0 && errno == EINTR);
        result = ChildWait::kTimedOut;
      }
      // A program that finished but left its output open to a process of its own: the program's
      // result stands; the rest of the output is not waited for.
      break;
    }
    struct pollfd fds[2];
    int n = 0;
    int outSlot = -1;
    int waitMs = static_cast<int>(deadlineMs - now > 1000000 ? 1000000 : deadlineMs - now);
    if (!exited) {
      if (pidFd >= 0) {
        fds[n++] = {pidFd, POLLIN, 0};
      } else if (waitMs > kPollStepMs) {
        waitMs = kPollStepMs;
      }
    }
    if (outFd >= 0) {
      outSlot = n;
      fds[n++] = {outFd, POLLIN, 0};
    }
    const int ready = poll(fds, static_cast<nfds_t>(n), waitMs);
    if (ready < 0 && errno != EINTR) {
      result = ChildWait::kError;
      if (!exited) {
        // Cannot watch it any more: keep the old behaviour of waiting for it.
        int e;
        do {
          e = waitpid(pid, status, 0);
        } while (e < 0 && errno == EINTR);
        result = e == pid ? ChildWait::kExited : ChildWait::kError;
      }
      break;
    }
    if (ready > 0 && outSlot >= 0 && fds[outSlot].revents != 0) {
      char buf[4096];
      const ssize_t got = read(outFd, buf, sizeof buf);
      if (got > 0) {
        if (out != nullptr) {
          try {
            out->append(buf, static_cast<std::size_t>(got));
          } catch (...) {
            // Out of memory: keep draining so the child is not blocked; the text is cut.
          }
        }
      } else if (got == 0 || (errno != EINTR && errno != EAGAIN)) {
        close(outFd);
        outFd = -1;
      }
    }
  }
  const int e = errno;
  if (outFd >= 0) close(outFd);
  if (pidFd >= 0) close(pidFd);
  errno = e;
  return result;
}

}  // namespace internal
}  // namespace vornplatform
