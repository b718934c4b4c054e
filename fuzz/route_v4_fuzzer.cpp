// The IPv4 kernel route file readers.
#include <cstddef>
#include <cstdint>

#include "entries/route_files.h"

extern "C" int LLVMFuzzerInitialize(int*, char***) {
  vornfuzz::QuietSyslog();
  return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  vornfuzz::ReadRouteFile<AF_INET>(data, size);
  return 0;
}
