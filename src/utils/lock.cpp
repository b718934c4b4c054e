#include "vornwireless/utils/lock.h"

#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include "vornplatform/file.h"
#include "vornplatform/lock.h"
#include "vornplatform/log.h"
#include "vornplatform/proc.h"

namespace vornwireless {
namespace utils {

namespace {
constexpr int kLockTries = 30;
}

FileLock::FileLock(std::string const& path, bool exclusive)
    : _fd(-1), _exclusive(exclusive), _path(path) {}

bool FileLock::Lock() {
  std::string::size_type slash = _path.rfind('/');
  if (slash != std::string::npos && slash > 0) {
    std::string dir = _path.substr(0, slash);
    if (VLIBCFileCheckDir(dir.c_str()) != 1 &&
        VLIBCExec("/bin/mkdir", "-p", dir.c_str(), nullptr, nullptr) != 0) {
      VORN_LOG(LOG_ERR, "Failed to create parent dir of [%s]", _path.c_str());
      return false;
    }
  }

  int fd = -1;
  for (int i = 0; i < kLockTries; ++i) {
    if (VLIBCFileLockByFile(_path.c_str(), _exclusive ? 1 : 0, &fd) == 1) {
      // The holder before us may have removed the file after we opened it: our lock counts only
      // while the path still names the file we locked.
      struct stat held;
      struct stat named;
      if (fstat(fd, &held) == 0 && stat(_path.c_str(), &named) == 0 &&
          held.st_dev == named.st_dev && held.st_ino == named.st_ino) {
        break;
      }
      VLIBCFileUnlockByFile(fd);
    }
    fd = -1;
    if (i + 1 < kLockTries) sleep(1);
  }
  if (fd < 0) {
    VORN_LOG(LOG_ERR, "Failed to get file lock of [%s]", _path.c_str());
    return false;
  }
  _fd = fd;
  return true;
}

bool FileLock::Unlock() {
  // Without a lock of ours the file belongs to whoever holds it: it is left alone.
  if (_fd < 0) {
    VORN_LOG(LOG_ERR, "Failed to release file lock of [%s]", _path.c_str());
    return false;
  }
  // The file is removed while we still hold it, and only when no other process shares it (a
  // shared lock is ours alone when it can become exclusive).
  bool removed = true;
  if (flock(_fd, LOCK_EX | LOCK_NB) == 0) {
    struct stat held;
    struct stat named;
    if (fstat(_fd, &held) == 0 && stat(_path.c_str(), &named) == 0 &&
        held.st_dev == named.st_dev && held.st_ino == named.st_ino) {
      removed = unlink(_path.c_str()) == 0;
    }
  }
  bool const released = VLIBCFileUnlockByFile(_fd) == 1;
  _fd = -1;
  if (!released || !removed) {
    VORN_LOG(LOG_ERR, "Failed to release file lock of [%s]", _path.c_str());
    return false;
  }
  return true;
}

}  // namespace utils
}  // namespace vornwireless
