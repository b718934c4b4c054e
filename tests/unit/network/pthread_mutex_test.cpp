// The plain mutex: lock, try-lock from another thread, unlock.
#include "vornwireless/network/pthread_mutex.h"

#include <gtest/gtest.h>

#include <atomic>
#include <thread>

using vornnetwork::network::PthreadMutex;

TEST(PthreadMutex, LockExcludesOtherThreads) {
  PthreadMutex mutex;
  ASSERT_TRUE(mutex.Lock());
  bool other = true;
  std::thread([&] { other = mutex.TryLock(); }).join();
  EXPECT_FALSE(other);
  EXPECT_TRUE(mutex.Unlock());
  std::thread([&] {
    other = mutex.TryLock();
    if (other) mutex.Unlock();
  }).join();
  EXPECT_TRUE(other);
}

TEST(PthreadMutex, IsNotRecursive) {
  PthreadMutex mutex;
  ASSERT_TRUE(mutex.TryLock());
  EXPECT_FALSE(mutex.TryLock());
  EXPECT_TRUE(mutex.Unlock());
}

TEST(PthreadMutex, GuardsACounter) {
  PthreadMutex mutex;
  long counter = 0;
  auto work = [&] {
    for (int i = 0; i < 20000; ++i) {
      mutex.Lock();
      ++counter;
      mutex.Unlock();
    }
  };
  std::thread a(work), b(work);
  a.join();
  b.join();
  EXPECT_EQ(counter, 40000);
}
