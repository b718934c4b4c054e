// Advisory file locks (flock) and the registry of this process's lock descriptors.
#include "vornplatform/lock.h"

#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>

#include "internal.h"
#include "vornplatform/err.h"

namespace {

// Lock descriptors + 1 (0 = free slot). Lock-free, so a child forked while another thread was
// locking can still walk it before exec.
constexpr int kMaxLocks = 256;
std::atomic<int> gLockFds[kMaxLocks];

void Remember(int fd) {
  for (auto& slot : gLockFds) {
    int expected = 0;
    if (slot.compare_exchange_strong(expected, fd + 1)) return;
  }
  // Registry full: the descriptor is still close-on-exec.
}

void Forget(int fd) {
  for (auto& slot : gLockFds) {
    int expected = fd + 1;
    if (slot.compare_exchange_strong(expected, 0)) return;
  }
}

}  // namespace

int VLIBCFileLockByFile(const char* path, int exclusive, int* fd) {
  if (fd != nullptr) *fd = -1;
  if (!vornplatform::internal::HasText(path) || fd == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  const int lockFd = open(path, O_RDWR | O_CREAT | O_CLOEXEC | O_NOCTTY, 0644);
  if (lockFd < 0) {
    VLIBC_ERR_SET(errno == ENOENT || errno == ENOTDIR ? VLIBC_ERR_NOT_FOUND : VLIBC_ERR_IO);
    return -1;
  }
  int rc;
  do {
    rc = flock(lockFd, (exclusive != 0 ? LOCK_EX : LOCK_SH) | LOCK_NB);
  } while (rc != 0 && errno == EINTR);
  if (rc != 0) {
    const bool busy = errno == EWOULDBLOCK;
    VLIBC_ERR_SET(busy ? VLIBC_ERR_BUSY : VLIBC_ERR_IO);
    close(lockFd);
    return busy ? 0 : -1;
  }
  Remember(lockFd);
  *fd = lockFd;
  return 1;
}

int VLIBCFileUnlockByFile(int fd) {
  if (fd < 0) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return 0;
  }
  if (flock(fd, LOCK_UN) != 0) {
    VLIBC_ERR_SET(errno == EBADF ? VLIBC_ERR_BAD_PARAMETER : VLIBC_ERR_IO);
    return 0;
  }
  Forget(fd);
  close(fd);
  return 1;
}

int VLIBCFileCloseLock() {
  for (auto& slot : gLockFds) {
    const int v = slot.exchange(0);
    if (v > 0) close(v - 1);
  }
  return 0;
}
