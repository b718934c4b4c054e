// Test peer: takes a FileLock in its own process and reports how it went.
//   vorn-test-lock-tool lock PATH [HOLD_MS]  -> prints "locked <seconds>" or "failed <seconds>"
// where seconds is the clock time the attempt took (the faked clock under the time seam).
#include <unistd.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <string>
#include <thread>

#include "vornwireless/utils/lock.h"

int main(int argc, char** argv) {
  if (argc < 3 || std::string(argv[1]) != "lock") {
    fprintf(stderr, "usage: %s lock PATH [HOLD_MS]\n", argv[0]);
    return 2;
  }
  vornwireless::utils::FileLock lock(argv[2], true);
  time_t start = time(nullptr);
  bool ok = lock.Lock();
  long took = static_cast<long>(time(nullptr) - start);
  printf("%s %ld\n", ok ? "locked" : "failed", took);
  fflush(stdout);
  if (ok && argc > 3) {
    std::this_thread::sleep_for(std::chrono::milliseconds(atoi(argv[3])));
    if (!lock.Unlock()) return 3;
  }
  return ok ? 0 : 1;
}
