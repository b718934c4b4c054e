// The open-vswitch service runs while its daemon's pid file names a living process.
#include "vornplatform/ovs.h"

#include "vornplatform/proc.h"

namespace VORN {
namespace OVS {

bool IsOVSRunning() { return VLIBCProcAliveByPidFile(VORN_OVS_PID_FILE) == 1; }

}  // namespace OVS
}  // namespace VORN
