// The section file readers and writers.
#include <cstddef>
#include <cstdint>

#include "entries/key_files.h"

extern "C" int LLVMFuzzerInitialize(int*, char***) {
  vornfuzz::QuietSyslog();
  return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  vornfuzz::ReadSectionFile(data, size);
  return 0;
}
