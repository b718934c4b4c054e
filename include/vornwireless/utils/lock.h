// A lock file that guards a resource between processes.
#ifndef VORNWIRELESS_UTILS_LOCK_H
#define VORNWIRELESS_UTILS_LOCK_H

#include <string>

namespace vornwireless {
namespace utils {

class FileLock {
 public:
  FileLock(std::string const& path, bool exclusive);
  virtual ~FileLock() = default;  // does not unlock: the descriptor lives until Unlock or exit
  FileLock(FileLock const&) = delete;
  FileLock& operator=(FileLock const&) = delete;

  // Makes the parent directory, then tries the lock 30 times, one second apart.
  bool Lock();
  // Releases the lock and removes the lock file.
  bool Unlock();

 private:
  int _fd;
  bool _exclusive;
  std::string _path;
};

}  // namespace utils
}  // namespace vornwireless

#endif
