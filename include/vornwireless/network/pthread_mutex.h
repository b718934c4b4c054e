// A plain (non-recursive) POSIX mutex for modules that want one.
#ifndef VORNWIRELESS_NETWORK_PTHREAD_MUTEX_H
#define VORNWIRELESS_NETWORK_PTHREAD_MUTEX_H

#include <pthread.h>

namespace vornnetwork {
namespace network {

class PthreadMutex {
 public:
  PthreadMutex();   // a failed init is only logged
  ~PthreadMutex();
  PthreadMutex(PthreadMutex const&) = delete;
  PthreadMutex& operator=(PthreadMutex const&) = delete;

  // Each is true when the POSIX call returned 0.
  bool Lock();
  bool Unlock();
  bool TryLock();

 private:
  pthread_mutex_t _mutex;
};

}  // namespace network
}  // namespace vornnetwork

#endif
