// Helpers shared by the fuzz entries: splitting one input into a method's string arguments and
// the checks an entry makes on the answer it got.
#ifndef VORN_FUZZ_ENTRIES_FUZZ_INPUT_H
#define VORN_FUZZ_ENTRIES_FUZZ_INPUT_H

#include <glib.h>
#include <syslog.h>

#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

namespace vornfuzz {

// The input split at NUL bytes into exactly `count` strings (a D-Bus string never holds a NUL):
// missing ones are empty, the last one takes the rest (NULs and all, cut at its first NUL).
inline std::vector<std::string> SplitArgs(const uint8_t* data, size_t size, size_t count) {
  std::vector<std::string> args;
  size_t start = 0;
  for (size_t i = 0; i < count; ++i) {
    size_t end = start;
    while (end < size && data[end] != 0) ++end;
    args.emplace_back(reinterpret_cast<const char*>(data) + (start < size ? start : size),
                      (start < size ? end - start : 0));
    start = end + 1;
  }
  return args;
}

// An answer that breaks the handler's contract ends the run like a crash does.
[[noreturn]] inline void Broken(const char* what) {
  std::fprintf(stderr, "contract broken: %s\n", what);
  std::abort();
}
inline void Require(bool ok, const char* what) {
  if (!ok) Broken(what);
}

// Millions of inputs must not fill the log: only LOG_EMERG lines pass (none of ours is one).
// VORN_FUZZ_SYSLOG=1 keeps every line (to read what one input did).
inline void QuietSyslog() {
  const char* keep = std::getenv("VORN_FUZZ_SYSLOG");
  if (keep == nullptr || std::string(keep) != "1") setlogmask(LOG_MASK(LOG_EMERG));
}

// The entries write /tmp, /var/lib and /usr/vorn: they run inside tests/sandbox/vorn-sandbox only.
inline void RequireSandbox() {
  const char* sb = std::getenv("VORN_SANDBOX");
  if (sb == nullptr || std::string(sb) != "1") {
    std::fprintf(stderr, "run me inside tests/sandbox/vorn-sandbox (bench/fuzz/run does)\n");
    std::exit(2);
  }
}

// A GError and an out string freed whatever the handler did with them.
struct Outcome {
  GError* error = nullptr;
  char* out = nullptr;
  ~Outcome() {
    g_clear_error(&error);
    g_free(out);
  }
};

}  // namespace vornfuzz

#endif
