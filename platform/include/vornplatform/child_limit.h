// Every program the platform starts has an end. Each call site has a generous default limit; a
// child that is still running when it passes is killed with its whole process group (every child
// runs as the leader of a group of its own), the event is logged at LOG_ERR with the program's
// path and the limit, and the caller sees a failure (-1, or NULL data) as for a program that
// could not run. A call site that must wait longer (or a test that wants to wait less) sets its
// own limit for the calls its thread makes inside a ScopedChildLimit.
#ifndef VORNPLATFORM_CHILD_LIMIT_H
#define VORNPLATFORM_CHILD_LIMIT_H

namespace vornplatform {

// Default limits in milliseconds.
constexpr long kExecLimitMs = 60000;    // VLIBCExec, VLIBCExec_S, VLIBCExecl, VLIBCExecv
constexpr long kPopenLimitMs = 60000;   // VLIBCPopen: from the start until VLIBCPclose reaps it
constexpr long kHookLimitMs = 30000;    // each executable of a hook
constexpr long kActionLimitMs = 60000;  // a platform action

// While an object lives, programs started by this thread get limitMs (> 0) instead of the call
// site's default. Objects nest; the innermost holds.
class ScopedChildLimit {
 public:
  explicit ScopedChildLimit(long limitMs);
  ~ScopedChildLimit();
  ScopedChildLimit(const ScopedChildLimit&) = delete;
  ScopedChildLimit& operator=(const ScopedChildLimit&) = delete;

 private:
  long _saved;
};

// The limit for a program this thread starts now: the innermost ScopedChildLimit, else defaultMs.
long ChildLimitMs(long defaultMs);

}  // namespace vornplatform

#endif
