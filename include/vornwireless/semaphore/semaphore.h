// A System V semaphore by key that gives one process at a time a resource. It exists only while
// someone needs it: the first Enter creates it, Release removes it. SEM_UNDO frees it when a
// holder dies. Enter waits at most the wait limit for a holder to release it (a holder keeps it
// for one modem command or one node hand-over, far below the default).
#ifndef VORNWIRELESS_SEMAPHORE_SEMAPHORE_H
#define VORNWIRELESS_SEMAPHORE_SEMAPHORE_H

namespace vornwireless {
namespace semaphore {

class Semaphore {
 public:
  static constexpr long kDefaultWaitLimitMs = 120000;

  explicit Semaphore(unsigned int key, long waitLimitMs = kDefaultWaitLimitMs)
      : _key(key), _waitLimitMs(waitLimitMs > 0 ? waitLimitMs : kDefaultWaitLimitMs) {}
  int Enter();    // 0, or -1 (also when the wait limit passed: errno EAGAIN in the log line)
  int Release();  // 0, or -1

 private:
  int Get(int* id);
  unsigned int _key;
  long _waitLimitMs;
};

}  // namespace semaphore
}  // namespace vornwireless

#endif
