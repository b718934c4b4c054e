#ifndef VORNWIRELESS_UTILS_CREATE_PID_FILE_H
#define VORNWIRELESS_UTILS_CREATE_PID_FILE_H

#include <string>

namespace vornwireless {
namespace utils {

// Writes our pid into path under a whole-file write lock and returns the descriptor, which must
// stay open for the life of the process. -1 when another instance holds the lock (no log line)
// or on failure (logged).
int CreatePidFile(std::string const& path);

}  // namespace utils
}  // namespace vornwireless

#endif
