// One logging macro for the whole tree. Every line goes to syslog as "<file>:<line> <message>",
// where <file> is the source path below src/ (e.g. "utils/config.cpp").
#ifndef VORNPLATFORM_LOG_H
#define VORNPLATFORM_LOG_H

#include <syslog.h>

namespace vornlog {

// The part of a compiler path after its last "/src/" (or the whole path when there is none).
constexpr const char* SourcePath(const char* path) {
  const char* found = path;
  for (const char* p = path; *p; ++p) {
    if (p[0] == '/' && p[1] == 's' && p[2] == 'r' && p[3] == 'c' && p[4] == '/') found = p + 5;
  }
  return found;
}

}  // namespace vornlog

#define VORN_SOURCE_FILE (::vornlog::SourcePath(__FILE__))

// VORN_LOG(LOG_ERR, "Failed to touch [%s]", path) -> "utils/config.cpp:42 Failed to touch [/x]"
#define VORN_LOG(priority, fmt, ...) \
  ::syslog((priority), "%s:%d " fmt, VORN_SOURCE_FILE, __LINE__, ##__VA_ARGS__)

#endif
