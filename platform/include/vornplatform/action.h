// Appliance services are platform actions: the executable /usr/vorn/libexec/platform/<Name> runs
// with the arguments as argv (no shell). A missing action is a successful no-op (LOG_DEBUG).
#ifndef VORNPLATFORM_ACTION_H
#define VORNPLATFORM_ACTION_H

#include <string>
#include <vector>

#define VORN_PLATFORM_ACTION_DIR "/usr/vorn/libexec/platform"

namespace vornplatform {
// The action's exit status (0 for a missing action), -1 when it could not run. When out is not
// NULL it receives the action's stdout (empty for a missing action).
int RunAction(const char* name, const std::vector<std::string>& args, std::string* out = nullptr);
}  // namespace vornplatform

int VORNFwRuleHup();    // 0 success, negative failure (error register set)
int VORNFwTcRuleHup();  // 0 success, negative failure

#endif
