// The modem information file.
#include <sys/stat.h>

#include <cstddef>
#include <cstdint>

#include "entries/info_files.h"

extern "C" int LLVMFuzzerInitialize(int*, char***) {
  vornfuzz::RequireSandbox();
  vornfuzz::QuietSyslog();
  mkdir(vornfuzz::kNodePrefix, 0755);
  return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  vornfuzz::ReadInfoFile(data, size);
  return 0;
}
