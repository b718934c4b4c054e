#include "vornwireless/utils/create_pid_file.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>

#include "vornplatform/log.h"

namespace vornwireless {
namespace utils {

int CreatePidFile(std::string const& path) {
  int fd = open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600);
  if (fd < 0) {
    VORN_LOG(LOG_ERR, "Could not open PID file [%s]", path.c_str());
    return -1;
  }
  struct flock lock;
  memset(&lock, 0, sizeof lock);
  lock.l_type = F_WRLCK;
  lock.l_whence = SEEK_SET;
  lock.l_start = 0;
  lock.l_len = 0;
  if (fcntl(fd, F_SETLK, &lock) < 0) {
    if (errno != EAGAIN && errno != EACCES) {
      VORN_LOG(LOG_ERR, "Unable to lock PID file [%s]", path.c_str());
    }
    close(fd);
    return -1;
  }
  if (ftruncate(fd, 0) < 0) {
    VORN_LOG(LOG_ERR, "Could not truncate PID file [%s]", path.c_str());
    close(fd);
    return -1;
  }
  char buf[32];
  int len = snprintf(buf, sizeof buf, "%ld\n", static_cast<long>(getpid()));
  if (write(fd, buf, static_cast<size_t>(len)) != len) {
    VORN_LOG(LOG_ERR, "Writing to PID file [%s]", path.c_str());
    close(fd);
    return -1;
  }
  return fd;
}

}  // namespace utils
}  // namespace vornwireless
