// A System V semaphore by key that gives one process at a time a resource. It exists only while
// someone needs it: the first Enter creates it, Release removes it. SEM_UNDO frees it when a
// holder dies.
#ifndef VORNWIRELESS_SEMAPHORE_SEMAPHORE_H
#define VORNWIRELESS_SEMAPHORE_SEMAPHORE_H

namespace vornwireless {
namespace semaphore {

class Semaphore {
 public:
  explicit Semaphore(unsigned int key) : _key(key) {}
  int Enter();    // 0, or -1
  int Release();  // 0, or -1

 private:
  int Get(int* id);
  unsigned int _key;
};

}  // namespace semaphore
}  // namespace vornwireless

#endif
