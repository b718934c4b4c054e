// Appliance services are platform actions: the executable /usr/vorn/libexec/platform/<Name> runs
// with the arguments as argv (no shell). A missing action is a successful no-op (LOG_DEBUG).
#ifndef VORNPLATFORM_ACTION_H
#define VORNPLATFORM_ACTION_H

#include <string>
#include <vector>

#define VORN_PLATFORM_ACTION_DIR "/usr/vorn/libexec/platform"

namespace vornplatform {
// Runs VORN_PLATFORM_ACTION_DIR/<name> with args as argv[1..] (argv[0] is its path), stdin from
// /dev/null, and waits. The action's exit status (0 for a missing action), -1 when it could not
// run, a signal ended it, it outlived its limit (kActionLimitMs of child_limit.h: then it was
// killed with its process group and that was logged), or name is not a plain file name (error
// register set). When out is not
// NULL it receives the action's stdout (empty for a missing action); otherwise stdout is ours.
int RunAction(const char* name, const std::vector<std::string>& args, std::string* out = nullptr);
// RunAction for an action that must succeed: 0 (a missing action included), -1 when it could not
// run or exited with another status (logged, error register set).
int RunStrictAction(const char* name, const std::vector<std::string>& args = {});
}  // namespace vornplatform

// The actions "VORNFwRuleHup" and "VORNFwTcRuleHup". 0 success (a missing action included),
// -1 on failure, a non-zero exit status included (error register set).
int VORNFwRuleHup();
int VORNFwTcRuleHup();

#endif
