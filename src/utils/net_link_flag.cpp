#include "vornwireless/utils/net_link_flag.h"

#include <unistd.h>

#include <cerrno>

#include "vornplatform/file.h"
#include "vornplatform/log.h"
#include "vornplatform/proc.h"

namespace vornwireless {
namespace utils {

char const* const kNetLinkFlagFile = "/tmp/.net_link_is_processing";

void SetNetLinkIsProcessing() {
  if (VLIBCProcPidFileCreate(kNetLinkFlagFile) < 0) {
    VORN_LOG(LOG_ERR, "Failed to write pid file: %s", kNetLinkFlagFile);
  }
}

void UnsetNetLinkIsProcessing() {
  // A flag that is already gone is what we want: only a real failure is worth a line.
  if (unlink(kNetLinkFlagFile) != 0 && errno != ENOENT) {
    VORN_LOG(LOG_ERR, "Failed to unlike pid file: %s", kNetLinkFlagFile);
  }
}

bool IsNetLinkProcessing() {
  if (VLIBCFileExist(kNetLinkFlagFile) != 1) return false;
  pid_t pid = VLIBCReadPidFile(kNetLinkFlagFile);
  return pid > 0 && VLIBCProcAlive(pid) == 1;
}

}  // namespace utils
}  // namespace vornwireless
