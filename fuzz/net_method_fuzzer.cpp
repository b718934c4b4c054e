// One com.vornlink.net handler (VORN_FUZZ_METHOD, table index) fed the input as its in string.
#include <cstddef>
#include <cstdint>

#include "entries/net_methods.h"

extern "C" int LLVMFuzzerInitialize(int*, char***) {
  vornfuzz::QuietSyslog();
  vornfuzz::EnsureRecordingModules();
  return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const std::string arg = vornfuzz::SplitArgs(data, size, 1)[0];
  vornfuzz::NetAnswer a = vornfuzz::CallNetMethod(VORN_FUZZ_METHOD, arg);
  vornfuzz::CheckNetAnswer(VORN_FUZZ_METHOD, arg, a);
  return 0;
}
