// One com.vornlink.usbmodem handler (VORN_FUZZ_METHOD, table index) fed the input as its in
// strings.
#include <cstddef>
#include <cstdint>

#include "entries/usbmodem_methods.h"

extern "C" int LLVMFuzzerInitialize(int*, char***) {
  vornfuzz::RequireSandbox();
  vornfuzz::QuietSyslog();
  return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  std::vector<std::string> args;
  vornfuzz::UsbmodemAnswer a =
      vornfuzz::CallUsbmodemMethodWithInput(VORN_FUZZ_METHOD, data, size, args);
  vornfuzz::CheckUsbmodemAnswer(VORN_FUZZ_METHOD, args, a);
  return 0;
}
