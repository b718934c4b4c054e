// The AT reply parsers of every dialect.
#include <cstddef>
#include <cstdint>

#include "entries/at_replies.h"

extern "C" int LLVMFuzzerInitialize(int*, char***) {
  vornfuzz::QuietSyslog();
  return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  vornfuzz::ParseAtReply(data, size);
  return 0;
}
