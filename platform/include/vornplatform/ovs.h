// State of the open-vswitch service.
#ifndef VORNPLATFORM_OVS_H
#define VORNPLATFORM_OVS_H

#define VORN_OVS_PID_FILE "/run/openvswitch/ovs-vswitchd.pid"

namespace VORN {
namespace OVS {

// True while the switch daemon runs: its pid file names a living process.
bool IsOVSRunning();

}  // namespace OVS
}  // namespace VORN

#endif
