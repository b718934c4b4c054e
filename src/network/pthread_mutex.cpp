// A plain POSIX mutex.
#include "vornwireless/network/pthread_mutex.h"

#include <cstring>

#include "vornplatform/log.h"

namespace vornnetwork {
namespace network {

PthreadMutex::PthreadMutex() {
  std::memset(&_mutex, 0, sizeof(_mutex));
  if (pthread_mutex_init(&_mutex, nullptr) != 0) {
    VORN_LOG(LOG_ERR, "Failed to init mutex");
  }
}

PthreadMutex::~PthreadMutex() { pthread_mutex_destroy(&_mutex); }

bool PthreadMutex::Lock() { return pthread_mutex_lock(&_mutex) == 0; }

bool PthreadMutex::Unlock() { return pthread_mutex_unlock(&_mutex) == 0; }

bool PthreadMutex::TryLock() { return pthread_mutex_trylock(&_mutex) == 0; }

}  // namespace network
}  // namespace vornnetwork
