// Helpers shared by the platform's source files. Not installed, not part of the API.
#ifndef VORNPLATFORM_SRC_INTERNAL_H
#define VORNPLATFORM_SRC_INTERNAL_H

#include <sys/types.h>

#include <cstdint>
#include <new>
#include <string>
#include <vector>

#include "vornplatform/err.h"

namespace vornplatform {
namespace internal {

// Runs body() and turns any exception into the failure value, recording the error. The
// platform's entry points are C-style: nothing may leave them by an exception.
template <typename R, typename F>
R NoThrow(R failure, F&& body) noexcept {
  try {
    return body();
  } catch (const std::bad_alloc&) {
    VLIBC_ERR_SET(VLIBC_ERR_NO_MEMORY);
  } catch (...) {
    VLIBC_ERR_SET(VLIBC_ERR_IO);
  }
  return failure;
}

// True for a non-NULL, non-empty C string.
inline bool HasText(const char* s) { return s != nullptr && *s != '\0'; }

// Whole file into out. 0; -1 with errno set (ENOENT for a missing file). Refuses files larger
// than maxBytes (EFBIG).
int ReadWholeFile(const char* path, std::string& out, std::size_t maxBytes = 64u << 20);

// Replaces path atomically with content: a temporary file in the same directory, fsync, rename.
// With keepMode an existing target keeps its mode and owner; otherwise (or for a new file) the
// file gets newMode. A symbolic link is written through. The temporary file is removed on every
// failure. 0; -1 with errno set (nothing recorded in the error register).
int AtomicWriteFile(const std::string& path, const std::string& content, mode_t newMode = 0644,
                    bool keepMode = true);

// mkdir -p with mode for the components it makes. 0; -1 with errno set.
int MakeDirs(const std::string& path, mode_t mode);

// Result of running a program.
struct SpawnResult {
  int status = -1;        // exit status 0..255; -1 when it could not start or a signal ended it
  int error = 0;          // errno of the failure to start (fork, pipe, exec), 0 when it ran
  int signal = 0;         // the signal that ended it, 0 otherwise
  bool timedOut = false;  // it outlived its limit and was killed (already logged)
};

// fork + execv(path, argv) without a shell, in a process group of its own, and waits for it at
// most limitMs (then kills the group, logs, and reports timedOut). argv must be NULL-terminated.
// When out is not NULL the child's stdout is read into *out; with nullStdin its stdin is
// /dev/null. Serialized with the fork functions of proc.cpp (see proc.h).
SpawnResult Spawn(const char* path, char* const argv[], std::string* out, bool nullStdin,
                  long limitMs);

// CLOCK_MONOTONIC in milliseconds (the clock every child limit is measured on).
int64_t MonotonicMs();

// SIGKILL to the process group led by pid (pid itself when it has none) and the LOG_ERR line
// naming path and the limit. pid must not have been reaped yet.
void KillChildGroup(pid_t pid, const char* path, long limitMs);

enum class ChildWait { kExited, kTimedOut, kError };
// Waits for child pid (the leader of its own process group) until deadlineMs on MonotonicMs(),
// reading outFd (when >= 0; closed on return) into *out (when not NULL) meanwhile. kExited: reaped,
// *status set. kTimedOut: the group was killed at the deadline (logged with path and limitMs)
// and the child reaped. kError: waitpid failed (errno set).
ChildWait WaitChildBounded(pid_t pid, const char* path, long limitMs, int64_t deadlineMs,
                           int* status, int outFd, std::string* out);

}  // namespace internal
}  // namespace vornplatform

#endif
