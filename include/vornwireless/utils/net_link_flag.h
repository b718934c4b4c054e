// The flag file that says a link change is being handled; it holds the handler's pid, so a dead
// handler does not block the system.
#ifndef VORNWIRELESS_UTILS_NET_LINK_FLAG_H
#define VORNWIRELESS_UTILS_NET_LINK_FLAG_H

namespace vornwireless {
namespace utils {

extern char const* const kNetLinkFlagFile;  // "/tmp/.net_link_is_processing"

void SetNetLinkIsProcessing();
void UnsetNetLinkIsProcessing();
bool IsNetLinkProcessing();

}  // namespace utils
}  // namespace vornwireless

#endif
